// Waves driven through open boundaries travel at the celerity of the
// dispersion relation, and a level boundary holds the amplitude it is given.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <numbers>

#include "data/tsfunc.hpp"
#include "processes/open_boundaries.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"

namespace {

constexpr double kPi = std::numbers::pi;
const double kG = static_cast<double>(9.81f);

// The wave number of a frequency by the dispersion relation, by bisection.
double WaveNumber(double omega, double d, double B) {
    double lo = 1e-6, hi = 100.0;
    for (int i = 0; i < 200; ++i) {
        const double k = 0.5 * (lo + hi), kd = k * d;
        const double w2 = kG * d * k * k * (1.0 + B * kd * kd) / (1.0 + (B + 1.0 / 3.0) * kd * kd);
        (w2 < omega * omega ? lo : hi) = k;
    }
    return 0.5 * (lo + hi);
}

struct Channel {
    double celerity = 0.0, theory = 0.0, amplitude = 0.0;
};

// A channel along x with an open west end at j = 0, driven by a sine of
// period T after a ramp of four periods; gauges at x1 and x2 in the middle
// row. The wave is looked at once the ramp's transient, which spreads at the
// group velocity, has passed, and before the reflection from the east end
// comes back.
Channel RunChannel(int32_t formulation, bool deep, double T, double a = 0.002) {
    const double d = 1.0, B = deep ? static_cast<double>(1.0f / 15.0f) : 0.0;
    const double omega = 2.0 * kPi / T, k = WaveNumber(omega, d, B);
    const double L = 2.0 * kPi / k, c = omega / k;
    bwtest::BasinSpec s;
    s.dx = s.dy = static_cast<float>(L / 30.0);
    s.J = static_cast<int32_t>(12.0 * L / s.dx);
    s.K = 4;
    s.depth = static_cast<float>(d);
    s.dt = T / 60.0;
    s.deepWater = deep;
    s.dispersionFactor = 1.0f / 15.0f;
    s.frameWest = false;
    const double x1 = 2.0 * L, x2 = 4.0 * L, ramp = 4.0 * T;
    const double cg = 0.5 * c;  // below the group velocity of every wave here
    const double tFrom = x2 / cg + ramp, tTo = tFrom + 4.0 * T;
    EXPECT_LT(tTo, (2.0 * s.J * s.dx - x2) / cg);
    s.steps = static_cast<int32_t>(tTo / s.dt);
    bwtest::MakeBasin(s);

    BoundaryRecord r;
    r.first[0] = 0, r.first[1] = 1, r.last[0] = 0, r.last[1] = s.K - 1;
    r.orientation = 1;
    r.formulation = formulation;
    // With the deep-water terms the boundary also gives the curvature of the
    // surface across a level boundary, the slope across a flux boundary.
    std::vector<float> series(s.steps + 1), across(s.steps + 1);
    const double amplitude = formulation == 0 ? a : a * c * d;  // a flux carries a*c*d
    for (int32_t n = 0; n <= s.steps; ++n) {
        const double t = n * s.dt;
        const double r = t < ramp ? 0.5 * (1.0 - std::cos(kPi * t / ramp)) : 1.0;
        series[n] = static_cast<float>(amplitude * r * std::sin(omega * t));
        across[n] = static_cast<float>(formulation == 0 ? -k * k * a * r * std::sin(omega * t)
                                                        : -k * a * r * std::cos(omega * t - k * 0.5 * s.dx));
    }
    TsAddSeries(r.seriesId, series.data());
    if (deep) TsAddSeries(r.deepSeriesId, across.data());
    gBoundaries.numberOfBoundaries = 1;
    gBoundaries.records = {r};
    BoundaryTable table;
    table.rows = s.K - 1;
    table.values.assign(6 * table.rows, 0.0f);
    for (int32_t row = 0; row < table.rows; ++row) table.Value(row, 2) = formulation == 0 ? 0.0f : 1.0f;
    gBoundaries.boundaryValues = {table};

    const size_t g1 = gGrid.At(static_cast<int32_t>(x1 / s.dx), 2);
    const size_t g2 = gGrid.At(static_cast<int32_t>(x2 / s.dx), 2);
    std::vector<double> h1, h2;
    bwtest::RunSteps(s.steps, [&](int32_t) {

        h1.push_back(gGrid.xi[g1]);
        h2.push_back(gGrid.xi[g2]);
    });
    // Delay of the up-crossings at the second gauge behind those at the first.
    const auto z1 = bwtest::ZeroCrossings(h1, s.dt), z2 = bwtest::ZeroCrossings(h2, s.dt);
    const double travel = (x2 - x1) / c;
    double delay = 0.0;
    int count = 0;
    for (double t1 : z1) {
        if (t1 < tFrom) continue;
        for (double t2 : z2)
            if (std::fabs(t2 - t1 - travel) < T / 4.0) {
                delay += t2 - t1;
                ++count;
            }
    }
    Channel result;
    result.theory = c;
    result.celerity = count > 0 ? (x2 - x1) / (delay / count) : 0.0;
    // Amplitude from the mean square over whole periods at the first gauge.
    const size_t from = static_cast<size_t>(tFrom / s.dt), to = from + 4 * 60;
    double mean = 0.0, square = 0.0;
    for (size_t i = from; i < to; ++i) mean += h1[i] / (to - from);
    for (size_t i = from; i < to; ++i) square += (h1[i] - mean) * (h1[i] - mean) / (to - from);
    result.amplitude = std::sqrt(2.0 * square) / a;
    return result;
}

TEST(BoundaryWave, ALevelBoundarySendsWavesAtTheCelerityOfTheRelationAndHoldsItsAmplitude) {
    for (bool deep : {false, true})
        for (double T : {2.0, deep ? 1.2 : 1.6}) {
            const Channel r = RunChannel(0, deep, T);
            EXPECT_NEAR(r.celerity / r.theory, 1.0, 0.01) << "deep " << deep << " T " << T;
            EXPECT_NEAR(r.amplitude, 1.0, 0.03) << "deep " << deep << " T " << T;
        }
}

TEST(BoundaryWave, AFluxBoundarySendsWavesAtTheCelerityOfTheRelation) {
    for (bool deep : {false, true}) {
        const Channel r = RunChannel(1, deep, 2.0);
        EXPECT_NEAR(r.celerity / r.theory, 1.0, 0.01) << "deep " << deep;
        EXPECT_NEAR(r.amplitude, 1.0, 0.05) << "deep " << deep;
    }
}

}  // namespace
