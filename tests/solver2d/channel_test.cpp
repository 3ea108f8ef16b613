// Waves in channels driven through open boundaries: they travel at the
// celerity of the dispersion relation with the amplitude the boundary is
// given, and the processes that take energy out of them work: a sponge layer
// absorbs what reaches it, a porous strip damps what passes, the filter
// removes a grid-scale zigzag and leaves a smooth wave.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <numbers>

#include "processes/porosity.hpp"
#include "processes/sponge.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"

namespace {

TEST(BoundaryWave, LevelAndFluxBoundariesSendWavesAtTheCelerityOfTheRelationWithTheirAmplitude) {
    const struct {
        int32_t formulation;  // 0 level, 1 flux
        bool deep;
        double T, amplitudeTolerance;
        float filter = 0.0f;  // the grid-scale filter, which must leave the wave as it comes in
    } cases[] = {{0, false, 2.0, 0.03},      {0, false, 1.6, 0.03},      {0, true, 2.0, 0.03},
                 {0, true, 1.2, 0.03},       {1, false, 2.0, 0.05},      {1, true, 2.0, 0.05},
                 {0, true, 1.2, 0.03, 0.2f}, {1, false, 2.0, 0.05, 0.2f}};
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << "formulation " << c.formulation << " deep " << c.deep
                                        << " T " << c.T << " filter " << c.filter);
        // Gauges two and four wavelengths in, on the middle row, looked at for
        // four periods from period 12 on: the ramp's transient, spreading at
        // the group velocity (above half the celerity for every wave here), has
        // passed the second gauge by then, and the reflection from the east
        // end, 20 wavelengths away from it along the way, is 40 periods off.
        const double a = 0.002;
        const bwtest::Channel ch = bwtest::MakeChannel(c.formulation, c.deep, c.T, a, 12, 16);
        gEquation.gridScaleFilter = c.filter;
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

// A channel of seven wavelengths (30 cells each) driven at its west end by a
// level boundary with a sine of 2 s and 2 mm in 1 m of water, run for
// `periods` periods, with or without the deep-water terms; prepare() sets its processes. Gives the
// lowest and highest wave height, relative to the driven one, over columns j0..j1 of the middle row
// in the last three periods.
std::pair<double, double> HeightRange(int32_t periods, int32_t j0, int32_t j1,
                                      const std::function<void()>& prepare, bool deep = false) {
    const double a = 0.002;
    const bwtest::Channel ch = bwtest::MakeChannel(0, deep, 2.0, a, 7, periods);
    prepare();
    std::vector<double> maxima(ch.J + 1, -1.0), minima(ch.J + 1, 1.0);
    bwtest::RunSteps(ch.steps, [&](int32_t n) {
        if (n < ch.steps - 3 * 60) return;
        for (int32_t j = j0; j <= j1; ++j) {
            const double x = gGrid.xi[gGrid.At(j, 2)] / a;
            maxima[j] = std::max(maxima[j], x), minima[j] = std::min(minima[j], x);
        }
    });
    double lo = 1e9, hi = 0.0;
    for (int32_t j = j0; j <= j1; ++j)
        lo = std::min(lo, (maxima[j] - minima[j]) / 2.0),
        hi = std::max(hi, (maxima[j] - minima[j]) / 2.0);
    return {lo, hi};
}

// A sponge over the last wavelength of the channel, its coefficient rising
// with the square of the distance into it, as a user would draw it.
void SpongeAtTheEnd() {
    gSponge.spongeType = true;
    const int32_t start = gGrid.J - 30;
    for (int32_t k = 0; k <= gGrid.K; ++k)
        for (int32_t j = start; j <= gGrid.J; ++j) {
            const double s = (j - start) / 30.0;
            gSponge.sponge[gGrid.At(j, k)] = static_cast<float>(1.0 + 0.3 * s * s);
        }
}

TEST(Damping, ASpongeOfOneWavelengthReflectsLessThanFivePercentOfTheEnergy) {
    // The envelope of the standing part in front of the sponge: with incident
    // height Hi and reflected Hr, it swings between Hi + Hr and Hi - Hr.
    const auto [lo, hi] = HeightRange(30, 60, 150, SpongeAtTheEnd);
    const double R = (hi - lo) / (hi + lo);
    EXPECT_LT(R * R, 0.05) << "reflection " << R;
    EXPECT_GT(hi, 0.5);
    // Without the sponge the wall reflects all: the envelope swings fully.
    const auto [wlo, whi] = HeightRange(30, 60, 150, [] {});
    EXPECT_GT((whi - wlo) / (whi + wlo), 0.5);
}

TEST(Damping, APorousStripDampsTheWavePassingThrough) {
    // A strip of stones of 5 cm, porosity 0.4, one wavelength wide: behind it
    // the wave is lower than in the open channel. Without the deep-water terms
    // the forced time extrapolation makes so strong a strip grow a circulation
    // after some 24 periods; with them (and no extrapolation), or with the
    // grid-scale filter, it runs steadily.
    struct Case {
        bool deep;
        int32_t periods;
        float filter;
    };
    for (const Case& c : {Case{false, 20, 0.0f}, Case{true, 40, 0.0f}, Case{false, 40, 0.05f}}) {
        SCOPED_TRACE(testing::Message()
                     << (c.deep ? "deep-water terms" : "shallow") << " filter " << c.filter);
        auto strip = [&] {
            SpongeAtTheEnd();
            gPorosity.porosityType = true;
            gPorosity.alpha = 1.4e-06f * 1000.0f / (0.05f * 0.05f);
            gPorosity.beta = 2.8f / 0.05f;
            for (int32_t k = 0; k <= gGrid.K; ++k)
                for (int32_t j = 60; j < 90; ++j) gPorosity.porosity[gGrid.At(j, k)] = 0.4f;
            gEquation.gridScaleFilter = c.filter;
        };
        const auto [olo, ohi] = HeightRange(c.periods, 100, 160, SpongeAtTheEnd, c.deep);
        EXPECT_GT(olo, 0.9);  // the open channel carries the wave undamped to the sponge
        const double shi = HeightRange(c.periods, 100, 160, strip, c.deep).second;
        EXPECT_LT(shi, 0.8 * ohi);
        EXPECT_GT(shi, 0.05);
    }
}

TEST(Damping, TheFilterRemovesAGridScaleZigzagAndKeepsASmoothWave) {
    bwtest::BasinSpec s;
    s.J = 61, s.K = 21, s.dx = s.dy = 0.2f, s.dt = 0.02, s.steps = 10;
    bwtest::MakeBasin(s);
    gFilter.type = 1;
    gFilter.filterCoef.assign(gGrid.Points(), 0.2f);
    auto smooth = [&](float x, float) {
        return 0.001 * std::cos(std::numbers::pi * (x - 0.5 * s.dx) / (60 * s.dx));
    };
    auto zigzag = [&](float x, float y) {
        return (std::lround(x / s.dx) + std::lround(y / s.dy)) % 2 == 0 ? 0.001 : -0.001;
    };
    bwtest::SetSurface(
        [&](float x, float y) { return static_cast<float>(smooth(x, y) + zigzag(x, y)); });
    const double smooth0 = bwtest::Project(smooth), zig0 = bwtest::Project(zigzag);
    bwtest::RunSteps(5);
    // Each pass keeps 0.8 of a checkerboard: ten passes (two a step) leave
    // about a tenth of it.
    EXPECT_LT(std::fabs(bwtest::Project(zigzag)), 0.12 * std::fabs(zig0));
    // The smooth wave moves on (a seventieth of its period) but keeps its size.
    EXPECT_NEAR(bwtest::Project(smooth) / smooth0, 1.0, 0.02);
}

}  // namespace
