// The stability of the scheme: the linear analysis against the growth the
// engine shows in a fine basin (h 0.45 m, dx 0.05 m, deep-water terms,
// extrapolation factor 1), the report of the log with the settings it
// proposes, and the grid-scale filter that makes such a basin stable.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <numbers>
#include <string>

#include "processes/shoreline.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/grid_filter.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/scheme_stability.hpp"
#include "solver2d/time_loop.hpp"
#include "support/log_capture.hpp"

namespace {

constexpr double kPi = std::numbers::pi;

// The fine basin of 60 x 60 water points in 0.45 m of water.
bwtest::BasinSpec FineBasin(double dt, int32_t steps) {
    bwtest::BasinSpec s;
    s.J = s.K = 61;
    s.dx = s.dy = 0.05f;
    s.dt = dt, s.steps = steps;
    s.deepWater = true, s.extrapolation = 1.0f;
    return s;
}

void MakeFineBasin(double dt, int32_t steps, float filter) {
    bwtest::MakeBasin(FineBasin(dt, steps));
    GridState& g = gGrid;
    for (float& b : g.bed)
        if (b < 0.0f) b = -0.45f;
    gEquation.gridScaleFilter = filter;
}

SchemeCase FineCase(double dt) {
    SchemeCase c;
    c.h = 0.45, c.dx = c.dy = 0.05, c.dt = dt, c.fe = 1.0, c.deep = true;
    c.B = static_cast<double>(1.0f / 15.0f);
    return c;
}

double MaxSurface() {
    const GridState& g = gGrid;
    double m = 0.0;
    for (size_t p = 0; p < g.Points(); ++p)
        if (g.bed[p] < 0.0f) m = std::max(m, static_cast<double>(std::fabs(g.xi[p])));
    return m;
}

TEST(SchemeStability, TheEngineGrowsAtTheRateTheAnalysisGives) {
    // A standing mode of the basin, seeded at 0.1 micrometre and run 80 steps
    // at dt 0.02 s: the fit x(n+1) = p x(n) - q x(n-1) to its amplitude over
    // the last 50 steps gives the eigenvalue that took over, |lambda| =
    // sqrt(q). It is the growing eigenvalue of the analysis for the mode, to
    // 1e-4, with both sweep families: the engine follows its scheme.
    const double L = 3.0;
    for (int32_t m : {59, 40})
        for (int32_t handle : {0, 1}) {
            bwtest::BasinSpec s = FineBasin(0.02, 80);
            s.convectiveHandle = handle;
            bwtest::MakeBasin(s);
            for (float& b : gGrid.bed)
                if (b < 0.0f) b = -0.45f;
            auto shape = [&](float x, float y) {
                return std::cos(m * kPi * (x - 0.025) / L) * std::cos(m * kPi * (y - 0.025) / L);
            };
            bwtest::SetSurface(
                [&](float x, float y) { return static_cast<float>(1e-7 * shape(x, y)); });
            std::vector<double> a;
            bwtest::RunSteps(80, [&](int32_t) { a.push_back(bwtest::Project(shape)); });
            double s11 = 0.0, s12 = 0.0, s22 = 0.0, r1 = 0.0, r2 = 0.0;
            for (size_t n = 30; n + 1 < a.size(); ++n) {
                const double x0 = a[n], x1 = a[n - 1], y = a[n + 1];
                s11 += x0 * x0, s12 -= x0 * x1, s22 += x1 * x1, r1 += y * x0, r2 -= y * x1;
            }
            const double q = (s11 * r2 - s12 * r1) / (s11 * s22 - s12 * s12);
            const double predicted = SpectralRadius(FineCase(0.02), m * kPi / 60, m * kPi / 60);
            EXPECT_GT(predicted, 1.09);
            EXPECT_NEAR(std::sqrt(q), predicted, 1e-4) << "mode " << m << " handle " << handle;
        }
}

TEST(SchemeStability, TheLogStatesTheCourantNumberAndWarnsWithStableSettings) {
    MakeFineBasin(0.02, 400, 0.0f);
    std::string text;
    {
        bwtest::LogCapture log;
        ReportSchemeStability();
        text = log.Text();
    }
    EXPECT_NE(text.find("Courant number sqrt(g h) dt/dx in the deepest water: 0.84 (h 0.45 m, "
                        "dx/h 0.111)"),
              std::string::npos)
        << text;
    EXPECT_NE(text.find("Warning: Time step beyond the stable range of the scheme"),
              std::string::npos)
        << text;
    // The step and the filter it proposes are stable, a step 5 % longer is not.
    const size_t at = text.find("a Time_step_interval of ");
    ASSERT_NE(at, std::string::npos);
    const double dt = std::stod(text.substr(at + 24));
    const size_t f = text.find("Grid_scale_filter of ");
    ASSERT_NE(f, std::string::npos);
    const double filter = std::stod(text.substr(f + 21));
    EXPECT_TRUE(SchemeStable(FineCase(dt)));
    EXPECT_FALSE(SchemeStable(FineCase(dt * 1.05)));
    SchemeCase filtered = FineCase(0.02);
    filtered.filter = filter;
    EXPECT_TRUE(SchemeStable(filtered));
    filtered.filter = filter * 0.9;
    EXPECT_FALSE(SchemeStable(filtered));

    // Stable settings: the Courant number and no warning.
    MakeFineBasin(0.002, 400, 0.0f);
    bwtest::LogCapture log;
    ReportSchemeStability();
    EXPECT_NE(log.Text().find("deepest water: 0.084 "), std::string::npos) << log.Text();
    EXPECT_EQ(log.Text().find("Warning"), std::string::npos) << log.Text();
}

TEST(GridScaleFilter, TakesTheCheckerboardDownAndKeepsVolumeAndLinearFields) {
    // A basin with an island: the filter keeps the volume of the surface,
    // leaves a field linear along a line alone where its stencil has water,
    // and takes the checkerboard down by 1 - 2c wherever it meets no land.
    bwtest::BasinSpec s;
    s.J = 20, s.K = 16;
    bwtest::MakeBasin(s);
    GridState& g = gGrid;
    g.bed[g.At(10, 8)] = 1.0f;
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
    gEquation.gridScaleFilter = 0.3f;
    MakeChains();
    SetupGridScaleFilter();
    auto water = [&](int32_t j, int32_t k) { return g.bed[g.At(j, k)] < 0.0f; };
    auto clear = [&](int32_t j, int32_t k) {  // no land within two points along x and y
        for (int32_t d = -2; d <= 2; ++d)
            if (j + d < 0 || j + d > g.J || k + d < 0 || k + d > g.K || !water(j + d, k) ||
                !water(j, k + d))
                return false;
        return true;
    };
    auto volume = [&] {
        double v = 0.0;
        for (int32_t k = 0; k <= g.K; ++k)
            for (int32_t j = 0; j <= g.J; ++j)
                if (water(j, k)) v += g.xi[g.At(j, k)];
        return v;
    };
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j)
            g.xi[g.At(j, k)] = water(j, k) ? ((j + k) % 2 ? -1e-3f : 1e-3f) + 0.01f * k : 0.0f;
    const Field before = g.xi;
    const double v0 = volume();
    CalcGridScaleFilter();
    EXPECT_NEAR(volume(), v0, 1e-6 * std::fabs(v0) + 1e-9);
    int32_t checked = 0;
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j) {
            if (!clear(j, k)) continue;
            const size_t p = g.At(j, k);
            const float smooth = 0.01f * k, wave = before[p] - smooth;
            EXPECT_NEAR(g.xi[p], smooth + wave * (1.0f - 2.0f * 0.3f), 2e-6f) << j << "," << k;
            ++checked;
        }
    EXPECT_GT(checked, 100);
}

TEST(GridScaleFilter, LeavesTheSlotAloneAndMovesNoWaterAcrossTheWaterline) {
    // A beach in the east of the basin with the moving shoreline: where the
    // surface stands below the bed (in the slot) nothing changes, and the
    // wet points keep their volume; a checkerboard on the wet points is taken
    // down where the stencil meets neither land nor the waterline.
    bwtest::BasinSpec s;
    s.J = 24, s.K = 10;
    bwtest::MakeBasin(s);
    GridState& g = gGrid;
    g.landValue = 0.5f;
    gShoreline.type = 1;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 14; j < g.J; ++j) g.bed[g.At(j, k)] = -1.0f + 0.15f * (j - 13);
    auto dry = [&](int32_t j, int32_t k) { return g.bed[g.At(j, k)] > 0.0f; };
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j) {
            const size_t p = g.At(j, k);
            g.xi[p] = g.bed[p] >= g.landValue ? 0.0f
                      : dry(j, k)             ? g.bed[p] - 0.05f
                                              : ((j + k) % 2 ? -1e-3f : 1e-3f);
        }
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
    gEquation.gridScaleFilter = 0.3f;
    MakeChains();
    SetupGridScaleFilter();
    const Field before = g.xi;
    double wet0 = 0.0, wet1 = 0.0;
    for (size_t p = 0; p < g.Points(); ++p)
        if (g.bed[p] < 0.0f) wet0 += g.xi[p];
    CalcGridScaleFilter();
    int32_t damped = 0;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 1; j < g.J; ++j) {
            const size_t p = g.At(j, k);
            if (dry(j, k)) {
                EXPECT_EQ(g.xi[p], before[p]) << j << "," << k;
                continue;
            }
            wet1 += g.xi[p];
            if (k >= 3 && k <= g.K - 3 && j >= 3 && j <= 16 && !dry(j + 2, k)) {
                EXPECT_NEAR(g.xi[p], before[p] * (1.0f - 2.0f * 0.3f), 1e-7f) << j << "," << k;
                ++damped;
            }
        }
    EXPECT_NEAR(wet1, wet0, 1e-6);
    EXPECT_GT(damped, 40);
}

TEST(GridScaleFilter, MakesTheFineBasinStableAtLittleCostToAResolvedWave) {
    // The basin that blows up at dt 0.02 s, with the filter the log proposes
    // and some margin: a diagonal standing wave of about 21 points a
    // wavelength (kh 2.7) runs 20 periods, nothing grows, and the wave loses
    // less than 1 % a period.
    const double dt = 0.02;
    SchemeCase c = FineCase(dt);
    c.filter = 0.15;
    ASSERT_TRUE(SchemeStable(c));
    const double L = 60 * 0.05, k = 4.0 * kPi * std::sqrt(2.0) / L;
    const double T = 2.0 * kPi / std::sqrt(bwtest::Omega2(k, 0.45, 1.0f / 15.0f));
    const int32_t periods = 20, steps = static_cast<int32_t>(periods * T / dt);
    MakeFineBasin(dt, steps, 0.15f);
    auto shape = [&](float x, float y) {
        return std::cos(4.0 * kPi * (x - 0.025) / L) * std::cos(4.0 * kPi * (y - 0.025) / L);
    };
    bwtest::SetSurface([&](float x, float y) { return static_cast<float>(1e-3 * shape(x, y)); });
    std::vector<double> a{bwtest::Project(shape)};
    bwtest::RunSteps(steps, [&](int32_t) { a.push_back(bwtest::Project(shape)); });
    const int32_t perPeriod = static_cast<int32_t>(T / dt);
    double last = 0.0;
    for (size_t i = a.size() - perPeriod; i < a.size(); ++i) last = std::max(last, std::fabs(a[i]));
    const double lossPerPeriod = 1.0 - std::pow(last / a.front(), 1.0 / (periods - 0.5));
    EXPECT_LT(lossPerPeriod, 0.01);
    EXPECT_GT(lossPerPeriod, 0.0);
    EXPECT_LT(MaxSurface(), 1.2e-3);
}

}  // namespace
