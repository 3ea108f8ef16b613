// The processes that take energy out of the waves, in small channels: a
// sponge layer absorbs what reaches it, a porous strip damps what passes,
// the filter removes a grid-scale zigzag and leaves a smooth wave.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <numbers>

#include "data/tsfunc.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/sponge.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"

namespace {

constexpr double kPi = std::numbers::pi;

// A channel along x, driven at its open west end by a level boundary with a
// sine of 2 s in 1 m of water (about 5.1 m long, 30 cells a wavelength),
// length L in wavelengths; before(j) gives the porosity or sponge of column j.
struct Flume {
    double L = 0.0, dx = 0.0;
    int32_t J = 0, steps = 0;
    std::vector<double> maxima, minima;  // extremes of xi along the axis over the last periods
};

Flume RunFlume(double lengthInWaves, double periods,
               const std::function<void(const Flume&)>& prepare) {
    const double T = 2.0, a = 0.002, d = 1.0;
    const double omega = 2.0 * kPi / T;
    Flume f;
    f.L = 5.1;
    f.dx = f.L / 30.0;
    f.J = static_cast<int32_t>(lengthInWaves * f.L / f.dx);
    bwtest::BasinSpec s;
    s.dx = s.dy = static_cast<float>(f.dx);
    s.J = f.J;
    s.K = 4;
    s.depth = static_cast<float>(d);
    s.dt = T / 60.0;
    s.frameWest = false;
    s.steps = f.steps = static_cast<int32_t>(periods * 60);
    bwtest::MakeBasin(s);
    prepare(f);

    BoundaryRecord r;
    r.first[0] = 0, r.first[1] = 1, r.last[0] = 0, r.last[1] = s.K - 1;
    r.orientation = 1;
    std::vector<float> series(s.steps + 1);
    for (int32_t n = 0; n <= s.steps; ++n) {
        const double t = n * s.dt, ramp = std::min(1.0, t / (4.0 * T));
        series[n] = static_cast<float>(a * ramp * std::sin(omega * t));
    }
    TsAddSeries(r.seriesId, series.data());
    gBoundaries.numberOfBoundaries = 1;
    gBoundaries.records = {r};
    BoundaryTable table;
    table.rows = s.K - 1;
    table.values.assign(6 * table.rows, 0.0f);
    gBoundaries.boundaryValues = {table};

    f.maxima.assign(f.J + 1, -1.0);
    f.minima.assign(f.J + 1, 1.0);
    const int32_t from = s.steps - 3 * 60;
    bwtest::RunSteps(s.steps, [&](int32_t n) {
        if (n < from) return;
        for (int32_t j = 0; j <= f.J; ++j) {
            const float x = gGrid.xi[gGrid.At(j, 2)];
            f.maxima[j] = std::max(f.maxima[j], static_cast<double>(x) / a);
            f.minima[j] = std::min(f.minima[j], static_cast<double>(x) / a);
        }
    });
    return f;
}

// Wave height relative to the driven one, from column j0 to j1.
std::pair<double, double> HeightRange(const Flume& f, int32_t j0, int32_t j1) {
    double lo = 1e9, hi = 0.0;
    for (int32_t j = j0; j <= j1; ++j) {
        const double h = (f.maxima[j] - f.minima[j]) / 2.0;
        lo = std::min(lo, h), hi = std::max(hi, h);
    }
    return {lo, hi};
}

// A sponge over the last wavelength of the flume, its coefficient rising
// with the square of the distance into it, as a user would draw it.
void SpongeAtTheEnd(const Flume& fl) {
    gSponge.spongeType = true;
    const int32_t start = fl.J - 30;
    for (int32_t k = 0; k <= gGrid.K; ++k)
        for (int32_t j = start; j <= fl.J; ++j) {
            const double s = (j - start) / 30.0;
            gSponge.sponge[gGrid.At(j, k)] = static_cast<float>(1.0 + 0.3 * s * s);
        }
}

TEST(Damping, ASpongeOfOneWavelengthReflectsLessThanFivePercentOfTheEnergy) {
    const Flume f = RunFlume(7.0, 30.0, SpongeAtTheEnd);
    // The envelope of the standing part in front of the sponge: with incident
    // height Hi and reflected Hr, it swings between Hi + Hr and Hi - Hr.
    const auto [lo, hi] = HeightRange(f, 60, 150);
    const double R = (hi - lo) / (hi + lo);
    EXPECT_LT(R * R, 0.05) << "reflection " << R;
    EXPECT_GT(hi, 0.5);
    // Without the sponge the wall reflects all: the envelope swings fully.
    const Flume wall = RunFlume(7.0, 30.0, [](const Flume&) {});
    const auto [wlo, whi] = HeightRange(wall, 60, 150);
    EXPECT_GT((whi - wlo) / (whi + wlo), 0.5);
}

TEST(Damping, APorousStripDampsTheWavePassingThrough) {
    auto run = [](bool porous) {
        return RunFlume(7.0, 24.0, [porous](const Flume& fl) {
            SpongeAtTheEnd(fl);
            if (!porous) return;
            // A strip of stones of 5 cm, porosity 0.4, one wavelength wide.
            gPorosity.porosityType = true;
            gPorosity.alpha = 1.4e-06f * 1000.0f / (0.05f * 0.05f);
            gPorosity.beta = 2.8f / 0.05f;
            for (int32_t k = 0; k <= gGrid.K; ++k)
                for (int32_t j = 60; j < 90; ++j) gPorosity.porosity[gGrid.At(j, k)] = 0.4f;
        });
    };
    const Flume open = run(false), strip = run(true);
    // Behind the strip the wave is lower than in the open channel.
    const auto [olo, ohi] = HeightRange(open, 100, 160);
    const auto [slo, shi] = HeightRange(strip, 100, 160);
    EXPECT_LT(shi, 0.8 * ohi);
    EXPECT_GT(shi, 0.05);
    EXPECT_GT(olo, 0.9);  // the open flume carries the wave undamped to the sponge
    (void)slo;
}

TEST(Damping, TheFilterRemovesAGridScaleZigzagAndKeepsASmoothWave) {
    bwtest::BasinSpec s;
    s.J = 61, s.K = 21, s.dx = s.dy = 0.2f, s.dt = 0.02, s.steps = 10;
    bwtest::MakeBasin(s);
    gFilter.type = 1;
    gFilter.filterCoef.assign(gGrid.Points(), 0.2f);
    const float L = 60 * s.dx;
    auto smooth = [&](float x, float) { return 0.001 * std::cos(kPi * (x - 0.5 * s.dx) / L); };
    auto zigzag = [&](float x, float y) {
        const int j = static_cast<int>(std::lround(x / s.dx)), k = static_cast<int>(std::lround(y / s.dy));
        return ((j + k) % 2 == 0 ? 1.0 : -1.0) * 0.001;
    };
    bwtest::SetSurface([&](float x, float y) { return static_cast<float>(smooth(x, y) + zigzag(x, y)); });
    const double smooth0 = bwtest::Project(smooth), zig0 = bwtest::Project(zigzag);
    bwtest::RunSteps(5);
    const double smooth1 = bwtest::Project(smooth), zig1 = bwtest::Project(zigzag);
    // Each pass keeps 0.8 of a checkerboard: ten passes (two a step) leave
    // about a tenth of it.
    EXPECT_LT(std::fabs(zig1), 0.12 * std::fabs(zig0));
    // The smooth wave moves on (a seventieth of its period) but keeps its size.
    EXPECT_NEAR(smooth1 / smooth0, 1.0, 0.02);
}

}  // namespace
