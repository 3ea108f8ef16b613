// The surface rollers: the settings read from WAVE_BREAKING, the renewal of
// slope, celerity and thickness on small grids built in memory, and waves
// breaking on a plane beach, driven through an open boundary.
#include "processes/rollers.hpp"

#include <gtest/gtest.h>
#include <omp.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <numbers>
#include <sstream>

#include "data/tsfunc.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/sponge.hpp"
#include "run/process.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"
#include "support/log_capture.hpp"
#include "support/test_support.hpp"

namespace {

constexpr double kG = static_cast<double>(kGravity);

class Rollers : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::LogCapture log;

    void TearDown() override {
        gRollers = RollerSettings{};
        gGeneration = GenerationState{};
        gPorosity = PorositySettings{};
        gSponge = SpongeSettings{};
    }
    // A basin over (0..J, 0..K) with a frame of land, the bed at `bed`, a
    // still surface at 0, and WAVE_BREAKING read from the given keys.
    void Make(int32_t J, int32_t K, float bed, const std::string& keys, float orientation = 0.0f,
              double dt = 0.05) {
        ResetModelState();
        gProcess.processorCount = omp_get_num_procs();
        gProcess.maxThreads = omp_get_max_threads();
        SetThreads(1);  // small grids: a thread's start costs more than the work
        gBasic = BasicSettings{};
        gBasic.numberOfDimensions = 2;
        GridState& g = gGrid;
        g.J = J, g.K = K, g.dx = g.dy = 0.5f, g.dt = dt, g.orientation = orientation;
        g.bed.assign(g.Points(), bed);
        for (int32_t k = 0; k <= K; ++k)
            for (int32_t j = 0; j <= J; ++j)
                if (j == 0 || j == J || k == 0 || k == K) g.bed[g.At(j, k)] = 1.0f;
        AllocateModelState();
        for (size_t p = 0; p < g.Points(); ++p) {
            g.xi[p] = g.xiPrev[p] = g.xiPrev2[p] = g.P[p] = g.Q[p] = g.PPrev[p] = g.QPrev[p] = 0.0f;
            g.depth[p] = g.xi[p] - g.bed[p];
        }
        MakeChains();
        gPorosity = PorositySettings{};
        gSponge = SpongeSettings{};
        gPorosity.porosity.assign(g.Points(), 1.0f);
        gSponge.sponge.assign(g.Points(), 1.0f);
        bwtest::WriteFile(dir / "m.bw", "TARNEL_BOUSSINESQ_WAVE {\nWAVE_BREAKING {\ntype = 1\n" +
                                            keys + "}\n}\n");
        KvtHandle file = KvtOpenFile(dir / "m.bw", false);
        gKvtAccess.logUnit = log.unit;  // the settings echoed into the captured log
        SetupWaveBreaking(KvtOpenTarget(file, "TARNEL_BOUSSINESQ_WAVE"));
        gKvtAccess.logUnit = -1;
        kvtClose(&file);
    }
    // A surface that rose by `rise` over the last step at every point:
    // xiPrev2 = 0, xiPrev = rise/2, xi = rise, fluxes 0.
    void Rise(float rise) {
        GridState& g = gGrid;
        for (size_t p = 0; p < g.Points(); ++p)
            if (g.bed[p] < 0.0f) {
                g.xiPrev2[p] = 0.0f, g.xiPrev[p] = 0.5f * rise, g.xi[p] = rise;
                g.depth[p] = g.xi[p] - g.bed[p];
            }
    }
    static double Speed(size_t p) { return std::hypot(gRollers.cx[p], gRollers.cy[p]); }
};

TEST_F(Rollers, TheDefaultDirectionRunsAlongTheGridsXAxisHoweverTheGridLies) {
    Make(6, 4, -1.0f, "", 30.0f);
    EXPECT_NE(log.Text().find("direction : 300 (default)"), std::string::npos);
    EXPECT_NEAR(gRollers.breakDirection, 0.0, 1e-12);
    EXPECT_NEAR(gRollers.tanInitial, std::tan(20.0 * std::numbers::pi / 180.0), 1e-7);
    const size_t p = gGrid.At(2, 2);
    EXPECT_FLOAT_EQ(gRollers.cx[p], static_cast<float>(1.3 * std::sqrt(kG)));
    EXPECT_EQ(gRollers.cy[p], 0.0f);
    EXPECT_EQ(gRollers.tanPhi[p], static_cast<float>(gRollers.tanInitial));

    // A direction a quarter turn from the default on the same grid runs along
    // +y, and velocity_type 3 keeps the celerity that way while breaking.
    Make(6, 4, -1.0f, "velocity_type = 3\ndirection = 210\n", 30.0f);
    EXPECT_NEAR(gRollers.breakDirection, std::numbers::pi / 2.0, 1e-6);
    Rise(0.2f);
    CalcBreaking(nullptr, 1);
    EXPECT_NEAR(gRollers.cx[p], 0.0, 1e-6);
    EXPECT_NEAR(gRollers.cy[p], std::sqrt(kG), 1e-5);  // c0 at the onset
}

TEST_F(Rollers, PorousSpongeDryAndSourcePointsNeverBreakAndNoRollerIsThickerThanTheWater) {
    Make(8, 4, -0.2f, "roller_factor = 4\n");
    GridState& g = gGrid;
    const size_t porous = g.At(2, 2), sponge = g.At(3, 2), source = g.At(4, 2),
                 dry = g.At(5, 2), open = g.At(6, 2), low = g.At(6, 3);
    gPorosity.porosity[porous] = 0.5f;
    gSponge.sponge[sponge] = 1.5f;
    gGeneration.numberOfRecords = 1;
    gGeneration.sourceIndex.assign(g.Points(), 0);
    gGeneration.sourceIndex[source] = 1;
    // The surface rises by 0.2 m in 0.05 s, far beyond any slope: every point
    // that may carry a roller breaks at once.
    Rise(0.2f);
    g.xi[dry] = -0.25f;  // a water point that has fallen dry
    g.bed[low] = -0.02f, g.depth[low] = g.xi[low] - g.bed[low];
    CalcBreaking(nullptr, 1);
    for (size_t p : {porous, sponge, dry}) {
        EXPECT_EQ(gRollers.delta[p], 0.0f) << p;
        EXPECT_EQ(gRollers.cx[p], 0.0f) << p;
        EXPECT_EQ(gRollers.cy[p], 0.0f) << p;
    }
    EXPECT_EQ(gRollers.delta[source], 0.0f);
    EXPECT_GT(Speed(source), 0.0);
    EXPECT_GT(gRollers.delta[open], 0.0f);
    // Thickness limited by the total depth where the rise would exceed it.
    EXPECT_EQ(gRollers.delta[low], g.depth[low]);
    for (int step = 0; step < 5; ++step) {
        CalcBreaking(nullptr, 1 + step % 2);
        for (size_t p = 0; p < g.Points(); ++p)
            ASSERT_LE(gRollers.delta[p], std::max(g.depth[p], 0.0f)) << p;
    }
}

TEST_F(Rollers, TheCelerityGrowsFromC0AsTheSlopeRelaxesAndKeepsItsLastValueOnAFlatSea) {
    // A surface rising steadily everywhere keeps every point breaking; the
    // slope then relaxes by (dt/2) ln2/half_time a half step, so after
    // half_time seconds of half steps half its way to the final slope is done.
    for (double factor : {1.3, 1.0}) {
        Make(8, 4, -1.0f, "velocity_type = 4\nhalf_time = 0.5\nvelocity_factor = " +
                              std::to_string(factor) + "\n");
        GridState& g = gGrid;
        const RollerSettings& r = gRollers;
        const size_t p = g.At(4, 2);
        Rise(0.2f);
        for (int32_t k = 1; k < g.K; ++k)  // a slope along x for the gradient
            for (int32_t j = 1; j < g.J; ++j) g.xi[g.At(j, k)] = 0.2f + 0.01f * j;
        const double c0 = std::sqrt(kG);
        const int halfSteps = 20;  // 20 x 0.025 s = half_time
        std::vector<double> speeds;
        for (int n = 0; n < halfSteps; ++n) {
            CalcBreaking(nullptr, 1 + n % 2);
            speeds.push_back(Speed(p));
        }
        EXPECT_NEAR((r.tanPhi[p] - r.tanFinal) / (r.tanInitial - r.tanFinal), 0.5, 0.02);
        // The first renewal still sees the initial slope: c0; then the speed
        // climbs, half way to velocity_factor c0 once half the slope's way is done.
        EXPECT_NEAR(speeds.front(), c0, 1e-5);
        EXPECT_NEAR(speeds.back(), c0 * (1.0 + 0.5 * (factor - 1.0)), 0.02 * c0);
        EXPECT_TRUE(std::is_sorted(speeds.begin(), speeds.end()));
    }

    // A flat sea at rest: no gradient and no flux, so type 1 keeps the
    // direction of the last celerity, at the length C (c0 off breaking).
    Make(8, 4, -1.0f, "");
    const size_t p = gGrid.At(4, 2);
    gRollers.cx[p] = -0.7f, gRollers.cy[p] = 0.4f;
    CalcBreaking(nullptr, 2);
    const double c0 = std::sqrt(kG), L = std::hypot(0.7, 0.4);
    EXPECT_NEAR(gRollers.cx[p], -0.7 / L * c0, 1e-5);
    EXPECT_NEAR(gRollers.cy[p], 0.4 / L * c0, 1e-5);
    EXPECT_EQ(gRollers.delta[p], 0.0f);
}

TEST_F(Rollers, AProgressiveWaveGivesARollerRunningWithItAndCarryingItsSlopeForward) {
    // A long wave running towards +x, xi = a sin(k x - w t), P = c xi, in
    // 1 m of water, seen where its front is steepest; its rollers run along +x.
    for (int type : {1, 2, 4, 5}) {
        Make(40, 4, -1.0f, "velocity_type = " + std::to_string(type) + "\n", 0.0f, 0.02);
        GridState& g = gGrid;
        const double a = 0.1, c = std::sqrt(kG), k = 2.0 * std::numbers::pi / 10.0, w = k * c;
        auto at = [&](double x, double t) { return static_cast<float>(a * std::sin(k * x - w * t)); };
        for (int32_t kk = 1; kk < g.K; ++kk)
            for (int32_t j = 1; j < g.J; ++j) {
                const size_t p = g.At(j, kk);
                const double x = j * g.dx;
                g.xi[p] = at(x, 0.0), g.xiPrev[p] = at(x, -0.01), g.xiPrev2[p] = at(x, -0.02);
                g.P[p] = static_cast<float>(c * at(x + 0.5 * g.dx, 0.0));
                g.depth[p] = g.xi[p] - g.bed[p];
            }
        // At x = 5 m (k x = pi) the crest is behind, the trough ahead: the
        // front, where the surface rises fastest.
        const size_t front = g.At(10, 2);
        CalcBreaking(nullptr, 1);
        SCOPED_TRACE(testing::Message() << "velocity_type " << type);
        EXPECT_GT(gRollers.cx[front], 0.5 * c);
        EXPECT_LT(std::fabs(gRollers.cy[front]), 1e-3 * c);
        if (type == 1 || type == 4) {
            EXPECT_NEAR(gRollers.cx[front], c, 1e-4 * c);  // C = c0 at the onset
        } else {
            EXPECT_NEAR(gRollers.cx[front], c, 0.05 * c);  // the wave's own speed
        }
    }

    // A lone breaking point whose roller runs east hands its relaxed slope to
    // its east neighbour, and the point behind it is back at the initial slope.
    Make(8, 4, -1.0f, "");
    const size_t p = gGrid.At(4, 2);
    gRollers.delta[p] = 0.01f;
    gRollers.tanPhi[p] = 0.3f;
    gRollers.cx[p] = 2.0f;
    CalcBreaking(nullptr, 1);
    EXPECT_LT(gRollers.tanPhi[p], 0.3f);
    EXPECT_EQ(gRollers.tanPhi[p + 1], gRollers.tanPhi[p]);
    EXPECT_EQ(gRollers.tanPhi[p - 1], static_cast<float>(gRollers.tanInitial));
}

// A short, coarse copy of a laboratory flume (Hansen and Svendsen, 1979,
// the waves of 1.67 s): 0.36 m of water, 1 m of flat bed, a slope of 1:34.3
// up to a wall where the water is 3 cm deep, a sponge over the last 0.5 m.
// Waves of 6.8 cm come from a level boundary at the west end, in a channel
// of three rows, dx 0.1 m and T/64 a step, for 16 periods. Gives the wave
// height and the mean level along the middle row over the last 4 periods,
// and checks at every step that no roller is thicker than the water and
// none stands in the sponge.
struct BeachProfile {
    std::vector<double> x, height, mean;
    double deltaMax = 0.0;
    bool breaks = false;
};

BeachProfile RunBeach(bool rollers) {
    constexpr double kDepth = 0.36, kSlope = 1.0 / 34.3, kFlat = 1.0, kPeriod = 1.67;
    constexpr double kHeight = 0.068, kDx = 0.1, kEnd = 0.03, kSponge = 0.5;
    constexpr int32_t kStepsAPeriod = 64, kPeriods = 16, kKept = 4;
    ResetModelState();
    gProcess.processorCount = omp_get_num_procs();
    gProcess.maxThreads = omp_get_max_threads();
    SetThreads(1);
    gPorosity = PorositySettings{};
    gSponge = SpongeSettings{};
    gFilter = FilterSettings{};
    gBoundaries = BoundaryState{};
    gRollers = RollerSettings{};
    gGeneration = GenerationState{};
    GridState& g = gGrid;
    const int32_t J = static_cast<int32_t>(std::lround((kFlat + (kDepth - kEnd) / kSlope) / kDx)) + 1;
    g.J = J, g.K = 4, g.dx = g.dy = static_cast<float>(kDx);
    g.dt = kPeriod / kStepsAPeriod;
    const int32_t steps = kStepsAPeriod * kPeriods;
    g.timeStepCount = steps;
    g.bed.resize(g.Points());
    auto X = [&](int32_t j) { return j * kDx - kFlat; };  // from the toe
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= J; ++j)
            g.bed[g.At(j, k)] = (k == 0 || k == g.K || j == J)
                                    ? 1.0f
                                    : static_cast<float>(-kDepth + std::max(X(j), 0.0) * kSlope);
    AllocateModelState();
    gEquation.extrapolationLower = 1.0f;
    gEquation.gridScaleFilter = 0.1f;  // the channel of three rows needs it
    gPorosity.porosity.assign(g.Points(), 1.0f);
    gSponge.spongeType = true;
    gSponge.sponge.assign(g.Points(), 1.0f);
    const double spongeFrom = (J - 1) * kDx - kSponge;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 0; j < J; ++j) {
            const double s = (j * kDx - spongeFrom) / kSponge;
            if (s > 0.0) gSponge.sponge[g.At(j, k)] = static_cast<float>(1.0 + 0.5 * s * s);
        }
    for (size_t p = 0; p < g.Points(); ++p) {
        g.xi[p] = g.xiPrev[p] = g.xiPrev2[p] = 0.0f;
        g.depth[p] = g.xi[p] - g.bed[p];
    }
    gBasic = BasicSettings{};
    RollerSettings& r = gRollers;
    if (rollers) {  // the defaults, as SetupWaveBreaking leaves them
        r.type = 1;
        r.tanInitial = std::tan(r.initialAngle * std::numbers::pi / 180.0);
        r.tanFinal = std::tan(r.finalAngle * std::numbers::pi / 180.0);
        for (std::vector<float>* f : {&r.tanPhi, &r.tanPhiOld, &r.delta, &r.deltaOld, &r.cx,
                                      &r.cxOld, &r.cy, &r.cyOld})
            f->assign(g.Points(), 0.0f);
        for (size_t p = 0; p < g.Points(); ++p) {
            r.cx[p] = static_cast<float>(r.velocityFactor *
                                         std::sqrt(kG * std::max(-static_cast<double>(g.bed[p]),
                                                                 r.minimumDepth)));
            r.tanPhi[p] = static_cast<float>(r.tanInitial);
        }
    }

    // A level boundary at j = 0, a sine ramped up over two periods.
    TsReset();
    TsInit(steps + 1);
    BoundaryRecord b;
    b.first[0] = 0, b.first[1] = 1, b.last[0] = 0, b.last[1] = g.K - 1, b.orientation = 1;
    std::vector<float> series(steps + 1);
    for (int32_t n = 0; n <= steps; ++n) {
        const double t = n * g.dt, ramp = std::min(t / (2.0 * kPeriod), 1.0);
        series[n] = static_cast<float>(0.5 * kHeight * ramp * std::sin(2.0 * std::numbers::pi * t / kPeriod));
    }
    TsAddSeries(b.seriesId, series.data());
    gBoundaries.numberOfBoundaries = 1;
    gBoundaries.records = {b};
    BoundaryTable table;
    table.rows = g.K - 1;
    table.values.assign(6 * table.rows, 0.0f);
    gBoundaries.boundaryValues = {table};

    BeachProfile out;
    const int32_t kept = kKept * kStepsAPeriod;
    std::vector<double> hi(J + 1, -1.0), lo(J + 1, 1.0), heightSum(J + 1, 0.0);
    out.mean.assign(J + 1, 0.0);
    PrepareTimeLoop();
    for (int32_t n = 1; n <= steps; ++n) {
        ComputeStep(n);
        gLoop.lineOrderFlag = !gLoop.lineOrderFlag;
        if (rollers) {
            for (size_t p = 0; p < g.Points(); ++p) {
                const float d = r.delta[p];
                if (d > 0.0f) out.breaks = true;
                out.deltaMax = std::max(out.deltaMax, static_cast<double>(d));
                EXPECT_LE(d, std::max(g.depth[p], 0.0f)) << "step " << n << " point " << p;
                if (gSponge.sponge[p] > 1.0f) {
                    EXPECT_EQ(d, 0.0f) << "step " << n;
                }
            }
        }
        if (n <= steps - kept) continue;
        for (int32_t j = 0; j <= J; ++j) {
            const double v = g.xi[g.At(j, 2)];
            hi[j] = std::max(hi[j], v), lo[j] = std::min(lo[j], v);
            out.mean[j] += v / kept;
        }
        if ((steps - n) % kStepsAPeriod == 0)  // the end of a period: its height
            for (int32_t j = 0; j <= J; ++j) {
                heightSum[j] += hi[j] - lo[j];
                hi[j] = -1.0, lo[j] = 1.0;
            }
    }
    for (int32_t j = 0; j <= J; ++j) {
        out.x.push_back(X(j));
        out.height.push_back(heightSum[j] / kKept);
    }
    gRollers = RollerSettings{};
    gSponge = SpongeSettings{};
    gEquation.gridScaleFilter = 0.0f;
    return out;
}

TEST(RollersOnABeach, HeightPeaksAndFallsThroughTheSurfZoneTheMeanLevelFallsThenRises) {
    const BeachProfile b = RunBeach(true);
    ASSERT_TRUE(b.breaks);
    // The points from the toe to the start of the sponge.
    auto index = [&](double x) {
        return static_cast<size_t>(std::lround((x - b.x.front()) / (b.x[1] - b.x[0])));
    };
    const size_t toe = index(0.0), end = index(b.x.back() - 0.7);
    const size_t peak =
        std::max_element(b.height.begin() + toe, b.height.begin() + end) - b.height.begin();
    const double xb = b.x[peak], hb = b.height[peak], h0 = b.height[toe];
    SCOPED_TRACE(testing::Message() << "breaking at x " << xb << " m, height " << hb
                                    << " m, at the toe " << h0 << " m");
    // Shoaling first (measured: 0.069 m at the toe, 0.104 m at 8.2 m), then
    // breaking on the upper slope.
    EXPECT_GT(hb, 1.15 * h0);
    EXPECT_GT(xb, 5.0);
    EXPECT_LT(xb, 9.5);
    // Through the surf zone the height falls: 0.7 m before the sponge less
    // than three quarters of the peak (measured: a third of it; this coarse
    // grid breaks more gently, see docs/validation.md).
    EXPECT_LT(b.height[end], 0.75 * hb);
    // Set-down before breaking, set-up behind it.
    const double atBreak = *std::min_element(b.mean.begin() + toe, b.mean.begin() + peak + 1);
    EXPECT_LT(atBreak, b.mean[toe] - 5e-4);
    EXPECT_GT(b.mean[end], atBreak + 2e-3);
    EXPECT_GT(b.mean[end], 0.0);
    EXPECT_LE(b.deltaMax, 0.36);

    // Without rollers nothing takes the energy out: the height at the same
    // place stays far above.
    const BeachProfile n = RunBeach(false);
    EXPECT_GT(n.height[end], 1.3 * b.height[end]);
}

}  // namespace
