// The surface estimate before each sweep is computed at the points of the
// chains of the other axis only, along the rows of the fields. Checked on a
// basin with an island of one point and a wall with a gap of one point (a
// chain of a single point), against a walk along the chains themselves.
#include <gtest/gtest.h>

#include <random>

#include "processes/porosity.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

namespace {

// The estimate at (j,k) from the continuity equation, the fluxes weighted
// wA (newer) and 1 - wA (older) along the chain's axis and wC, 1 - wC across.
float Expected(int32_t j, int32_t k, bool columns, bool single) {
    const GridState& g = gGrid;
    const size_t p = g.At(j, k);
    const float wP = columns ? 0.875f : 0.375f, wQ = columns ? 0.375f : 0.875f;
    const float dPx = (g.P[p] - g.P[p - 1]) * wP + (g.PPrev[p] - g.PPrev[p - 1]) * (1.0f - wP);
    const float dQy = (g.Q[p] - g.Q[p - g.Stride()]) * wQ +
                      (g.QPrev[p] - g.QPrev[p - g.Stride()]) * (1.0f - wQ);
    const float div = single ? (columns ? dPx / g.dx : dQy / g.dy) : dPx / g.dx + dQy / g.dy;
    return static_cast<float>(g.xiPrev[p] - g.dt * div / gPorosity.porosity[p]);
}

TEST(SurfaceEstimate, CoversThePointsOfTheChainsAndNoOther) {
    bwtest::BasinSpec s;
    s.J = 23, s.K = 9, s.dx = 0.5f, s.dy = 0.7f;
    bwtest::MakeBasin(s);
    GridState& g = gGrid;
    g.bed[g.At(6, 4)] = 1.0f;  // an island of one point
    for (int32_t k = 1; k < s.K; ++k)
        if (k != 5) g.bed[g.At(15, k)] = 1.0f;  // a wall with a gap at k = 5
    bwtest::SetSurface([](float, float) { return 0.0f; });
    MakeChains();
    std::mt19937 random(7);
    std::uniform_real_distribution<float> value(-1.0f, 1.0f);
    for (Field* f : {&g.P, &g.PPrev, &g.Q, &g.QPrev, &g.xiPrev})
        for (float& x : *f) x = value(random);
    for (float& n : gPorosity.porosity) n = 0.5f + 0.5f * std::abs(value(random));

    for (bool columns : {true, false}) {
        const float kUntouched = 123.0f;
        std::vector<float> estimate(g.Points(), kUntouched), expected(g.Points(), kUntouched);
        // The chains of the other axis, walked one by one: the inner points,
        // the ends where the code along lets the flux in, all of a chain of one point.
        const int32_t lines = columns ? g.J : g.K;
        for (int32_t l = 0; l <= lines; ++l) {
            const int32_t count = columns ? gChains.chainCountY[l] : gChains.chainCountX[l];
            for (int32_t c = 1; c <= count; ++c) {
                const ChainPair& ch = columns ? gChains.Y(l, c) : gChains.X(l, c);
                auto at = [&](int32_t i) { return columns ? g.At(l, i) : g.At(i, l); };
                const std::vector<int32_t>& along = columns ? gChains.codeX : gChains.codeY;
                const bool single = ch.first == ch.last;
                const int32_t from = single || along[at(ch.first)] == 2 ? ch.first : ch.first + 1;
                const int32_t to = single || along[at(ch.last)] == 3 ? ch.last : ch.last - 1;
                for (int32_t i = from; i <= to; ++i)
                    expected[at(i)] = Expected(columns ? l : i, columns ? i : l, columns, single);
            }
        }
        columns ? ExtrapolateSurfaceElevationX(estimate.data())
                : ExtrapolateSurfaceElevationY(estimate.data());
        int32_t singles = 0;
        for (int32_t k = 0; k <= g.K; ++k)
            for (int32_t j = 0; j <= g.J; ++j) {
                const size_t p = g.At(j, k);
                EXPECT_EQ(estimate[p], expected[p]) << (columns ? "x" : "y") << " (" << j << "," << k << ")";
                singles += (columns ? gChains.surfaceX : gChains.surfaceY)[p] == 2;
            }
        // The gap's column is a chain of a single point; no row is.
        EXPECT_EQ(singles, columns ? 1 : 0);
    }
}

}  // namespace
