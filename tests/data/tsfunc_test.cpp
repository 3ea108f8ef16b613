#include "data/tsfunc.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <vector>

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

TEST_F(SeriesStore, NoSeriesOpensNothing) {
    TsInit(10);
    TsReadStep(1);
    EXPECT_EQ(gTs.tsFileA, nullptr);
    EXPECT_EQ(gTs.tsPosition, -1);
    EXPECT_EQ(TsValue(0), kTsNoValue);
    EXPECT_EQ(TsValue(1), kTsNoValue);
}

TEST_F(SeriesStore, RowsComeBackStepByStepWhereverTheStoreEnded) {
    for (int count : {1, 2, 3, 4}) {
        TsReset();
        TsInit(6);
        std::vector<int32_t> ids(count);
        for (int n = 0; n < count; ++n) TsAddSeries(ids[n], Ramp(6, 100.0f * (n + 1)).data());
        for (int n = 0; n < count; ++n) EXPECT_EQ(ids[n], n + 1);
        FILE* a = gTs.tsFileA;
        FILE* b = gTs.tsFileB;
        TsReadStep(1);  // passes over the row of step 0
        // After an odd number of series the store is in the first file, else in the second.
        EXPECT_EQ(gTs.tsFile, count % 2 == 1 ? a : b) << count;
        for (int step = 1; step <= 5; ++step) {
            if (step > 1) TsReadStep(step);
            for (int n = 0; n < count; ++n)
                EXPECT_EQ(TsValue(ids[n]), 100.0f * (n + 1) + step) << count << " " << step;
        }
        EXPECT_EQ(TsValue(0), kTsNoValue);
        EXPECT_EQ(TsValue(count + 1), kTsNoValue);
    }
}

TEST_F(SeriesStore, ReadingStartsAtAnyStepAndOnlyGoesForward) {
    TsInit(5);
    int32_t id = 0;
    TsAddSeries(id, Ramp(5, 0.5f).data());
    TsReadStep(3);
    EXPECT_EQ(TsValue(id), 3.5f);
    setenv("TRF", "HUD", 1);  // stop texts go to standard error, where the death test reads them
    EXPECT_EXIT(TsReadStep(3), testing::ExitedWithCode(1), "tsfunc: internal error\\(6\\)");
    EXPECT_EXIT(TsAddSeries(id, Ramp(5, 0.0f).data()), testing::ExitedWithCode(1),
                "tsfunc: Reading has already started");
    unsetenv("TRF");
    TsReadStep(4);
    EXPECT_EQ(TsValue(id), 4.5f);
}

}  // namespace
