// Waves driven through open boundaries travel at the celerity of the
// dispersion relation, and the boundary holds the amplitude it is given.
#include <gtest/gtest.h>

#include <cmath>

#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"

namespace {

TEST(BoundaryWave, LevelAndFluxBoundariesSendWavesAtTheCelerityOfTheRelationWithTheirAmplitude) {
    const struct {
        int32_t formulation;  // 0 level, 1 flux
        bool deep;
        double T, amplitudeTolerance;
    } cases[] = {{0, false, 2.0, 0.03}, {0, false, 1.6, 0.03}, {0, true, 2.0, 0.03},
                 {0, true, 1.2, 0.03},  {1, false, 2.0, 0.05}, {1, true, 2.0, 0.05}};
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message()
                     << "formulation " << c.formulation << " deep " << c.deep << " T " << c.T);
        // Gauges two and four wavelengths in, on the middle row, looked at for
        // four periods from period 12 on: the ramp's transient, spreading at
        // the group velocity (above half the celerity for every wave here), has
        // passed the second gauge by then, and the reflection from the east
        // end, 20 wavelengths away from it along the way, is 40 periods off.
        const double a = 0.002;
        const bwtest::Channel ch = bwtest::MakeChannel(c.formulation, c.deep, c.T, a, 12, 16);
        const size_t g1 = gGrid.At(60, 2), g2 = gGrid.At(120, 2);
        std::vector<double> h1, h2;
        bwtest::RunSteps(ch.steps, [&](int32_t) {
            h1.push_back(gGrid.xi[g1]);
            h2.push_back(gGrid.xi[g2]);
        });
        // Mean delay of the zero crossings at the second gauge behind those at the first.
        const double tFrom = 12.0 * c.T, distance = 60 * ch.dx, travel = distance / ch.c;
        double delay = 0.0;
        int count = 0;
        for (double t1 : bwtest::ZeroCrossings(h1, ch.dt))
            for (double t2 : bwtest::ZeroCrossings(h2, ch.dt))
                if (t1 >= tFrom && std::fabs(t2 - t1 - travel) < c.T / 4.0)
                    delay += t2 - t1, ++count;
        ASSERT_GT(count, 0);
        EXPECT_NEAR(distance / (delay / count) / ch.c, 1.0, 0.01);
        // Amplitude from the mean square over the four periods at the first gauge.
        const size_t from = static_cast<size_t>(tFrom / ch.dt), to = from + 4 * 60;
        double mean = 0.0, square = 0.0;
        for (size_t i = from; i < to; ++i) mean += h1[i] / (to - from);
        for (size_t i = from; i < to; ++i) square += (h1[i] - mean) * (h1[i] - mean) / (to - from);
        EXPECT_NEAR(std::sqrt(2.0 * square) / a, 1.0, c.amplitudeTolerance);
    }
}

}  // namespace
