// The figures of bw -check: the mean period of a series by its zero
// up-crossings, and the wave number of the equations solved, checked against
// the relation itself and its long-wave limit.
#include "input/model_check.hpp"

#include <gtest/gtest.h>

#include <cmath>

namespace {

TEST(ModelCheck, PeriodOfASeriesAndWaveNumberOfTheEquations) {
    // A sine of 2.5 s about a level of 0.3, sampled at 0.05 s, with a phase
    // that puts no crossing on a sample; a still series has no period.
    std::vector<float> series;
    for (int n = 0; n < 400; ++n)
        series.push_back(0.3f + static_cast<float>(std::sin(2 * M_PI * (n * 0.05 - 0.013) / 2.5)));
    EXPECT_NEAR(MeanZeroCrossingPeriod(series, 0.05), 2.5, 1e-3);
    EXPECT_EQ(MeanZeroCrossingPeriod(std::vector<float>(50, 0.0f), 0.05), 0.0);

    const double g = static_cast<double>(9.81f);
    // Without the deep-water terms w^2 stays below 3 g / h: at 4 m no wave
    // is shorter than 2.32 s.
    EXPECT_EQ(ModelWaveNumber(2.3, 4.0, 0.0), 0.0);
    EXPECT_GT(ModelWaveNumber(2.35, 4.0, 0.0), 0.0);
    for (const double B : {0.0, 1.0 / 15.0}) {
        for (const double T : {2.5, 8.0, 30.0}) {
            const double h = 4.0, k = ModelWaveNumber(T, h, B), kh2 = (k * h) * (k * h);
            const double w2 = g * h * k * k * (1 + B * kh2) / (1 + (B + 1.0 / 3.0) * kh2);
            EXPECT_NEAR(w2, std::pow(2 * M_PI / T, 2), 1e-9) << B << " " << T;
        }
        // Long waves travel at sqrt(g h).
        EXPECT_NEAR(2 * M_PI / 600.0 / ModelWaveNumber(600.0, 1.0, B), std::sqrt(g), 1e-4);
    }
}

}  // namespace
