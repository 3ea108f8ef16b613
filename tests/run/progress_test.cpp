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
    }
    std::vector<std::string> Records() {
        FlushUnits();
        return bwtest::ReadLines(stem + "._spi_");
    }
};

TEST_F(ProgressChannel, EveryStepWritesItsFourRecordsInOrder) {
    bwtest::WriteFile(stem + "._kill_", "stale");
    OpenProgressChannel(stem);
    EXPECT_FALSE(fs::exists(stem + "._kill_"));  // a stale kill file is removed at the start
    int code = 0;
    StartProgress(0, 250, code);  // a factor of exactly 4 per mille a step
    ReportProgress(125, 1000, code);
    ReportProgress(250, 1000, code);
    EXPECT_EQ(code, 0);
    auto lines = Records();
    ASSERT_EQ(lines.size(), 12u);
    EXPECT_EQ(lines[0], "STALBL Simulation date and time [YYYY-MM-DD hh:mm:ss]");
    EXPECT_EQ(lines[1], "MESLBL Simulation time step");
    EXPECT_EQ(lines[2], "STATUS 2004-01-01 23:59:00");
    EXPECT_EQ(lines[3], "PROGRE          0");
    EXPECT_EQ(lines[4], "STATUS 2004-01-02 00:00:02");  // 125 steps of 0.5 s roll the day
    EXPECT_EQ(lines[5], "MESSAG Time step: 125");
    EXPECT_EQ(lines[6].substr(0, 7), "COMSPD ");
    EXPECT_GE(lines[6].size(), 17u);  // at least ten columns, right-aligned
    EXPECT_GT(std::stoll(lines[6].substr(7)), 0);
    EXPECT_EQ(lines[7], "PROGRE        500");
    EXPECT_EQ(lines[11], "PROGRE       1000");
}

TEST_F(ProgressChannel, ProgressNeverExceedsOneThousand) {
    OpenProgressChannel(stem);
    int code = 0;
    StartProgress(10, 13, code);
    ReportProgress(20, 1, code);  // beyond the last step
    EXPECT_EQ(Records().back(), "PROGRE       1000");
}

TEST_F(ProgressChannel, KillFileCancelsAtTheNextCheckAndStaysSeen) {
    bwtest::LogCapture log;
    OpenProgressChannel(stem);
    int code = 0;
    StartProgress(0, 100, code);
    ReportProgress(1, 10, code);
    EXPECT_EQ(code, 0);
    bwtest::WriteFile(stem + "._kill_", "");
    ReportProgress(2, 10, code);
    EXPECT_EQ(code, -1);
    fs::remove(stem + "._kill_");
    EXPECT_TRUE(IsCancelled());  // removing the file afterwards changes nothing
    EXPECT_EQ(log.Lines().back(), "Run is cancelled by the user ...");
}

TEST_F(ProgressChannel, ChannelNameDropsLogAndInpParts) {
    OpenProgressChannel(dir / "run.inp");
    EXPECT_EQ(gProgress.channelBase, dir / "run");
    EXPECT_TRUE(fs::exists(dir / "run._spi_"));
    ReleaseUnit(gProgress.progressUnit);
    gProgress.progressUnit = -1;
    OpenProgressChannel(dir / "plain");
    EXPECT_EQ(KillFileName(), dir / "plain._kill_");
}

TEST_F(ProgressChannel, UpdateIntervalThinsTheReports) {
    gProgress.updateInterval = 3600;
    OpenProgressChannel(stem);
    int code = 0;
    StartProgress(0, 100, code);
    for (int step = 1; step <= 50; ++step) ReportProgress(step, 10, code);
    EXPECT_EQ(Records().size(), 4u);  // only the records of the start
}

TEST(ProgressModes, StdoutShowsOnlyMessagesAndNoneShowsNothing) {
    testing::internal::CaptureStdout();
    setenv("TARN_PROGRESS", "STDOUT", 1);
    gProgress = ProgressState{};
    OpenProgressChannel("unused");
    int code = 0;
    StartProgress(0, 10, code);
    ReportProgress(3, 10, code);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "Time step: 3\n");
    EXPECT_EQ(gProgress.channelBase, "");

    setenv("TARN_PROGRESS", "NONE", 1);
    gProgress = ProgressState{};
    OpenProgressChannel("unused");
    EXPECT_EQ(gProgress.progressUnit, -1);
    EXPECT_EQ(KillFileName(), "._kill_");
    unsetenv("TARN_PROGRESS");
}

}  // namespace
