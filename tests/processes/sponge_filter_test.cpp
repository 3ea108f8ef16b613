// The sponge's damping towards the rest state and the explicit filter's
// smoothing along the chains, on small grids built in memory.
#include <gtest/gtest.h>

#include <cmath>
#include <functional>

#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/model_state.hpp"

namespace {

// A basin of water (bed -2) with a frame of land (bed 1) and a still surface.
void MakeGrid(int32_t J, int32_t K) {
    ResetModelState();
    gShoreline = ShorelineSettings{};
    gSponge = SpongeSettings{};
    gFilter = FilterSettings{};
    GridState& g = gGrid;
    g.J = J, g.K = K, g.dx = g.dy = 1.0f;
    g.bed.assign(g.Points(), -2.0f);
    for (int32_t k = 0; k <= K; ++k)
        for (int32_t j = 0; j <= J; ++j)
            if (j == 0 || j == J || k == 0 || k == K) g.bed[g.At(j, k)] = 1.0f;
    AllocateModelState();
    for (size_t p = 0; p < g.Points(); ++p) {
        g.xi[p] = 0.0f;
        g.depth[p] = g.xi[p] - g.bed[p];
    }
    MakeChains();
    gSponge.sponge.assign(g.Points(), 1.0f);
}

TEST(Sponge, ACoefficientOf100RemovesNinetyNinePercent) {
    MakeGrid(6, 4);
    GridState& g = gGrid;
    const size_t p = g.At(3, 2), land = g.At(0, 2);
    gSponge.sponge[p] = gSponge.sponge[land] = 100.0f;
    for (Field* f : {&g.xi, &g.P, &g.Q, &g.PPrev, &g.QPrev}) (*f)[p] = (*f)[land] = 0.5f;
    AbsorpWaveEnergy();
    for (Field* f : {&g.xi, &g.P, &g.Q, &g.PPrev, &g.QPrev}) {
        EXPECT_FLOAT_EQ((*f)[p], 0.005f);
        EXPECT_EQ((*f)[land], 0.5f);  // land: untouched
    }

    // The references shift the rest state: the surface is drawn towards 1.
    gOptions.spongeReferenceS = 1.0f;
    gOptions.spongeReferenceP = -0.5f;
    g.xi[p] = 0.0f;
    g.P[p] = 0.5f;
    AbsorpWaveEnergy();
    EXPECT_FLOAT_EQ(g.xi[p], 0.99f);
    EXPECT_FLOAT_EQ(g.P[p], -0.49f);
    gOptions = OptionSettings{};
}

class Filter : public testing::Test {
protected:
    void SetUp() override {
        MakeGrid(41, 6);
        gFilter.type = 1;
        gFilter.filterCoef.assign(gGrid.Points(), 0.2f);
    }
    void TearDown() override { gFilter = FilterSettings{}; }
    // Sets xi and P along row k = 3 (and xi on the other water rows too) by f(j).
    void Fill(const std::function<float(int32_t)>& f) {
        GridState& g = gGrid;
        for (int32_t k = 0; k <= g.K; ++k)
            for (int32_t j = 0; j <= g.J; ++j) g.xi[g.At(j, k)] = g.P[g.At(j, k)] = f(j);
    }
    double RowAmplitude(const Field& field, int32_t from, int32_t to) {
        double a = 0.0;
        for (int32_t j = from; j <= to; ++j)
            a = std::max(a, static_cast<double>(std::fabs(field[gGrid.At(j, 3)])));
        return a;
    }
};

TEST_F(Filter, ConstantsStayGridScaleWavesAreDampedAndSmallCoefficientsLeftAlone) {
    // A neighbour on land or beyond a chain's end stands in as the point
    // itself, so a constant stays constant up to the frame.
    GridState& g = gGrid;
    Fill([](int32_t) { return 0.7f; });
    CalcFilterX();
    CalcFilterY();
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 1; j < g.J; ++j) EXPECT_FLOAT_EQ(g.xi[g.At(j, k)], 0.7f) << j << "," << k;

    // A zigzag along x (P): the centre keeps 1 - 4a = 0.9, the two neighbours
    // along the line give 2a of the opposite sign and the two across it 2a
    // of the same: 0.9 stays. A checkerboard (the surface) meets opposite
    // signs all round: 1 - 8a = 0.8 stays. A coefficient below 0.01 leaves
    // its point alone.
    Fill([](int32_t j) { return j % 2 == 0 ? 0.1f : -0.1f; });
    for (int32_t k = 0; k <= g.K; k += 2)
        for (int32_t j = 0; j <= g.J; ++j) g.xi[g.At(j, k)] = -g.xi[g.At(j, k)];
    gFilter.filterCoef[g.At(10, 2)] = 0.009f;
    CalcFilterX();
    EXPECT_NEAR(RowAmplitude(g.xi, 2, 39), 0.08, 1e-7);
    EXPECT_EQ(g.xi[g.At(10, 2)], -0.1f);
    EXPECT_NEAR(RowAmplitude(g.P, 2, 38), 0.09, 1e-7);
}

}  // namespace
