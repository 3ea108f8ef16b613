#include "data/tsfunc.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "support/test_support.hpp"

namespace {

class SeriesStore : public testing::Test {
protected:
    void SetUp() override { TsReset(); }
    void TearDown() override { TsReset(); }
    // A series whose value at step s is base + s.
    static std::vector<float> Ramp(int steps, float base) {
        std::vector<float> v(steps);
        for (int s = 0; s < steps; ++s) v[s] = base + static_cast<float>(s);
        return v;
    }
};

// Reading may start at any step, then goes forward one step at a time; id 0
// gives no value; no series is added once reading started; there is no row
// behind the last.
TEST_F(SeriesStore, ReadingStartsAtAnyStepAndOnlyGoesForward) {
    TsInit(5);
    int32_t id = 0;
    TsAddSeries(id, Ramp(5, 0.5f).data());
    EXPECT_EQ(TsValue(id), kTsNoValue);  // no row in memory yet
    TsReadStep(3);
    EXPECT_EQ(TsValue(id), 3.5f);
    EXPECT_EQ(TsValue(0), kTsNoValue);
    setenv("TRF", "HUD", 1);  // stop texts go to standard error, where the death test reads them
    EXPECT_EXIT(TsReadStep(3), testing::ExitedWithCode(1), "tsfunc: internal error\\(6\\)");
    EXPECT_EXIT(TsAddSeries(id, Ramp(5, 0.0f).data()), testing::ExitedWithCode(1),
                "tsfunc: Reading has already started");
    TsReadStep(4);
    EXPECT_EQ(TsValue(id), 4.5f);
    EXPECT_EXIT(TsReadStep(5), testing::ExitedWithCode(1), "tsfunc: Unable to read scratch file");
    unsetenv("TRF");
}

// The scratch files lie in the temporary folder but leave no name there, not
// even while in use, so nothing remains however the process ends.
TEST_F(SeriesStore, ScratchFilesLeaveNothingInTheTemporaryFolder) {
    bwtest::TempDir tmp;
    const char* old = std::getenv("TMPDIR");
    const std::string saved = old ? old : "";
    setenv("TMPDIR", tmp.path.c_str(), 1);
    TsInit(1000);
    int32_t ids[3] = {};
    for (int n = 0; n < 3; ++n) TsAddSeries(ids[n], Ramp(1000, 10.0f * n).data());
    EXPECT_TRUE(std::filesystem::is_empty(tmp.path));
    for (FILE* file : {gTs.tsFileA, gTs.tsFileB}) {
        ASSERT_NE(file, nullptr);
        // The kernel still knows where the open file was made, and that its name is gone.
        const auto where =
            std::filesystem::read_symlink("/proc/self/fd/" + std::to_string(fileno(file))).string();
        EXPECT_EQ(where.rfind((tmp.path / "bw_series_").string(), 0), 0u) << where;
        EXPECT_NE(where.find(" (deleted)"), std::string::npos) << where;
    }
    for (int step = 1; step < 1000; ++step) TsReadStep(step);
    EXPECT_EQ(TsValue(ids[2]), 20.0f + 999.0f);
    old ? setenv("TMPDIR", saved.c_str(), 1) : unsetenv("TMPDIR");
}

}  // namespace
