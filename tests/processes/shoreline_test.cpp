// The slot of the moving shoreline: its storage width and the effective depth
// over slot and bed, against the closed forms of the integral of the width;
// the limit on what a point may lose through a held flux.
#include "processes/shoreline.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "solver2d/model_state.hpp"

namespace {

constexpr double kWidth = 0.01, kLambda = 100.0, kSlotBottom = -10.0, kMax = 999.0;

double Width(double surface, double bed) {
    return StorageWidth(surface, -bed, kSlotBottom, kMax, kWidth, kLambda);
}

TEST(StorageWidth, FullAboveTheBedNarrowingIntoTheSlot) {
    const double r = 0.5 / 9.0;  // half a metre into a slot of 9 m
    const struct {
        double surface, bed, width;
    } cases[] = {
        {-1.0, -1.0, 1.0},  // surface at the bed
        {-1.5, -1.0, kWidth + (1 - kWidth) * std::exp(-kLambda * r)},
        {-20.0, -10.0, 1.0},  // a bed at the slot's bottom has no slot
        // A bed far above the slot's bottom measures r against 999 m.
        {1000.0, 1500.0, kWidth + (1 - kWidth) * std::exp(-kLambda * 500.0 / 999.0)},
    };
    for (const auto& c : cases)
        EXPECT_DOUBLE_EQ(Width(c.surface, c.bed), c.width) << c.surface << " over " << c.bed;
}

TEST(SlotDepth, BranchesMeetAtTheBedIntegrateTheWidthAndSpareLandAndDeepBeds) {
    ResetModelState();
    gShoreline = ShorelineSettings{};
    gShoreline.type = 1;
    gGrid.J = 0, gGrid.K = 0;
    gGrid.landValue = 1.0f;
    // The corrected depth of a plain depth v over a bed b, at a single point.
    auto Corrected = [](float v, float bed) {
        SlotCorrection(&v, &bed);
        return static_cast<double>(v);
    };
    const double hs = -1.0 - kSlotBottom, e = std::exp(-kLambda);
    const double atBed = hs * ((1 - e) * (1 - kWidth) / kLambda + kWidth);
    EXPECT_NEAR(Corrected(0.0f, -1.0f), atBed, 1e-6);
    EXPECT_NEAR(Corrected(1e-6f, -1.0f), atBed, 1e-5);
    // Below the bed: the integral of the width from the slot's bottom up to the
    // surface, checked by a midpoint sum of StorageWidth.
    const double v = -0.3;
    double sum = 0.0;
    const int n = 20000;
    const double z0 = kSlotBottom, z1 = -1.0 + v;
    for (int i = 0; i < n; ++i) sum += Width(z0 + (i + 0.5) * (z1 - z0) / n, -1.0);
    sum *= (z1 - z0) / n;
    EXPECT_NEAR(Corrected(static_cast<float>(v), -1.0f), sum, 1e-4);

    // A bed at the land value or below the slot keeps the plain depth.
    gGrid.J = 1;
    float bed[2] = {1.0f, -10.5f}, depth[2] = {-0.5f, 0.7f};
    SlotCorrection(depth, bed);
    EXPECT_EQ(depth[0], -0.5f);
    EXPECT_EQ(depth[1], 0.7f);
    gShoreline = ShorelineSettings{};
}

TEST(LimitOutflow, NoPointLosesMoreThanAQuarterOfItsWaterAndEachFaceKeepsOneValue) {
    ResetModelState();
    gShoreline = ShorelineSettings{};
    GridState& g = gGrid;
    g.J = 6, g.K = 4, g.dx = 0.5f, g.dy = 0.25f, g.dt = 0.1;
    g.bed.assign(g.Points(), -1.0f);
    g.xi.assign(g.Points(), 0.0f);
    g.P.assign(g.Points(), 0.02f);  // 0.02 m2/s east in 1 m: a Courant number of 0.004, untouched
    g.Q.assign(g.Points(), -0.02f);
    const size_t dry = g.At(2, 2), thin = g.At(4, 2);
    g.bed[dry] = 0.1f;                  // in the slot: 0.1 m under its bed
    g.bed[thin] = -0.01f;               // 1 cm of water above its bed
    g.P[thin - 1] = -0.05f;             // it loses westwards and eastwards
    const std::vector<float> P0 = g.P, Q0 = g.Q;
    LimitOutflow(1);
    // The dry point sends nothing east; it still takes what comes from the west.
    EXPECT_EQ(g.P[dry], 0.0f);
    EXPECT_EQ(g.P[dry - 1], P0[dry - 1]);
    // The thin point sends out a quarter of its water over the half step: the
    // sum of its outflows is 0.25 * 0.01 * dx / (dt/2), shared in proportion.
    const double out = -static_cast<double>(g.P[thin - 1]) + g.P[thin];
    EXPECT_NEAR(out, 0.25 * 0.01 * 0.5 / 0.05, 1e-6);
    EXPECT_NEAR(g.P[thin] / -g.P[thin - 1], 0.02 / 0.05, 1e-6);
    // Everything else as it was, to the bit, and Q is not touched.
    for (size_t p = 0; p < g.Points(); ++p) {
        if (p != dry && p != thin && p != thin - 1) {
            EXPECT_EQ(g.P[p], P0[p]) << p;
        }
    }
    EXPECT_EQ(g.Q, Q0);
    // Along y the same with dy: the dry point sends nothing south.
    LimitOutflow(2);
    EXPECT_EQ(g.Q[dry - g.Stride()], 0.0f);
    EXPECT_EQ(g.Q[dry], Q0[dry]);
    gShoreline = ShorelineSettings{};
}

}  // namespace
