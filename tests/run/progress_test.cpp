#include "run/progress.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>

#include "run/units.hpp"
#include "support/log_capture.hpp"

namespace fs = std::filesystem;

namespace {

class ProgressChannel : public testing::Test {
protected:
    bwtest::TempDir dir;
    std::string stem = dir / "model";
    void SetUp() override {
        unsetenv("TARN_PROGRESS");
        gProgress = ProgressState{};
        gProgress.simulationStart = MakeDateTime(2004, 1, 1, 23, 59, 0);
        gProgress.timeStep = 0.5;
    }
    void TearDown() override {
        if (gProgress.progressUnit > 0) ReleaseUnit(gProgress.progressUnit);
        gProgress = ProgressState{};
        unsetenv("TARN_PROGRESS");
    }
    std::vector<std::string> Records() {
        FlushUnits();
        return bwtest::ReadLines(stem + "._spi_");
    }
};

// The records a viewer reads, per mille at most 1000; an update interval
// thins the reports; the kill file cancels at the next check, for good.
TEST_F(ProgressChannel, ReportsInOrderAndTheCancel) {
    bwtest::LogCapture log;
    OpenProgressChannel(stem);
    int code = 0;
    StartProgress(0, 250, code);  // a factor of exactly 4 per mille a step
    ReportProgress(125, 1000, code);
    ReportProgress(250, 1000, code);
    ReportProgress(300, 1000, code);  // beyond the last step
    auto lines = Records();
    ASSERT_EQ(lines.size(), 16u);
    EXPECT_EQ(lines[2], "STATUS 2004-01-01 23:59:00");
    EXPECT_EQ(lines[3], "PROGRE          0");
    EXPECT_EQ(lines[4], "STATUS 2004-01-02 00:00:02");  // 125 steps of 0.5 s roll the day
    EXPECT_EQ(lines[5], "MESSAG Time step: 125");
    EXPECT_TRUE(lines[6].starts_with("COMSPD ") && std::stoll(lines[6].substr(7)) > 0) << lines[6];
    EXPECT_EQ(lines[7], "PROGRE        500");
    EXPECT_EQ(lines[15], "PROGRE       1000");

    gProgress.updateInterval = 3600;
    for (int step = 301; step <= 350; ++step) ReportProgress(step, 10, code);
    EXPECT_EQ(Records().size(), 16u);
    bwtest::WriteFile(stem + "._kill_", "");
    ReportProgress(351, 10, code);
    fs::remove(stem + "._kill_");
    EXPECT_TRUE(IsCancelled());
    EXPECT_EQ(log.Lines().back(), "Run is cancelled by the user ...");
}

// The channel's files drop the last ".log" and ".inp" parts of the name;
// TARN_PROGRESS sends only the messages to standard output, or nothing anywhere.
TEST_F(ProgressChannel, NamesAndModes) {
    OpenProgressChannel(dir / "run.inp.log.x");
    EXPECT_TRUE(fs::exists(dir / "run._spi_"));
    ReleaseUnit(gProgress.progressUnit);
    // Only in the file's own name: a folder's ".log" stays.
    fs::create_directory(dir / "a.log");
    OpenProgressChannel((dir / "a.log") + "/b");
    EXPECT_TRUE(fs::exists((dir / "a.log") + "/b._spi_"));
    ReleaseUnit(gProgress.progressUnit);
    fs::remove_all(dir / "a.log");

    gProgress = ProgressState{};
    testing::internal::CaptureStdout();
    setenv("TARN_PROGRESS", "STDOUT", 1);
    OpenProgressChannel(dir / "out");
    int code = 0;
    StartProgress(0, 10, code);
    ReportProgress(3, 10, code);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "Time step: 3\n");
    setenv("TARN_PROGRESS", "NONE", 1);
    OpenProgressChannel(dir / "none");
    // Of the three channels only the first made a file.
    EXPECT_EQ(std::distance(fs::directory_iterator(dir.path), fs::directory_iterator()), 1);
}

}  // namespace
