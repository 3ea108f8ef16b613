// Eddy viscosity in a closed basin. A circulation of one cell, with a flat
// surface and no divergence, is a steady flow of the equations that only
// the viscosity wears down: with a constant viscosity its amplitude decays
// as exp(-nu k^2 t), k the wave number of the cell; with the Smagorinsky
// field the viscosity follows the strain and so the amplitude, and 1/A
// grows linearly in time instead. The walls stand at the faces beside the
// frame of land and let the flow slip along them.
#include <gtest/gtest.h>

#include <cmath>
#include <numbers>
#include <vector>

#include "processes/friction.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

namespace {

constexpr double kPi = std::numbers::pi;

// A basin of n x n water points of 1 m, 1 m deep.
constexpr int32_t kCells = 20;
constexpr double kLength = kCells;

// The stream function of the cell at the corner (x, y) between points.
double Psi(double x, double y, double a) {
    return a * std::sin(kPi * (x - 0.5) / kLength) * std::sin(kPi * (y - 0.5) / kLength);
}

// Sets the fluxes of the cell, P = dpsi/dy and Q = -dpsi/dx, as differences
// of psi at the corners, so that the discrete divergence is zero.
void SetCell(double a) {
    GridState& g = gGrid;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 1; j < g.J; ++j) {
            const size_t p = g.At(j, k);
            const double x = j, y = k;
            if (j < g.J - 1)
                g.P[p] = g.PPrev[p] =
                    static_cast<float>(Psi(x + 0.5, y + 0.5, a) - Psi(x + 0.5, y - 0.5, a));
            if (k < g.K - 1)
                g.Q[p] = g.QPrev[p] =
                    static_cast<float>(Psi(x - 0.5, y + 0.5, a) - Psi(x + 0.5, y + 0.5, a));
        }
}

// The amplitude of the cell in the fluxes P, by projection.
double Amplitude() {
    const GridState& g = gGrid;
    double num = 0.0, den = 0.0;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 1; j < g.J - 1; ++j) {
            const double s = Psi(j + 0.5, k + 0.5, 1.0) - Psi(j + 0.5, k - 0.5, 1.0);
            num += s * g.P[g.At(j, k)], den += s * s;
        }
    return num / den;
}

void MakeCellBasin(double dt, int32_t steps) {
    bwtest::BasinSpec s;
    s.J = s.K = kCells + 1;
    s.dt = dt;
    s.steps = steps;
    bwtest::MakeBasin(s);
    gEddy = EddySettings{};
}

// The amplitude after each of `steps` steps.
std::vector<double> RunCell(int32_t steps) {
    std::vector<double> a;
    bwtest::RunSteps(steps, [&](int32_t) { a.push_back(Amplitude()); });
    return a;
}

TEST(EddyViscosity, AConstantViscosityWearsACellDownAtTheRateOfTheDiffusion) {
    const double dt = 0.25, nu = 0.03, a0 = 1e-3;
    const int32_t steps = 2000;
    MakeCellBasin(dt, steps);
    gEddy.eddyType = 1;
    gEddy.eddyViscosity.assign(gGrid.Points(), static_cast<float>(nu));
    SetCell(a0);
    const std::vector<double> a = RunCell(steps);
    // The discrete Laplacian of the cell, free slip at the walls.
    const double k2 = 2.0 * (2.0 - 2.0 * std::cos(kPi / kLength));
    const double expected = std::exp(-nu * k2 * steps * dt);
    const double measured = a.back() / a0;
    EXPECT_NEAR(measured, expected, 0.01 * expected) << "decay over " << steps * dt << " s";
    EXPECT_LT(measured, 0.5);  // the decay is large enough to tell the rate
    // The surface stays flat: the flow is steady but for the viscosity.
    for (size_t p = 0; p < gGrid.Points(); ++p)
        if (gGrid.bed[p] < 0.0f) EXPECT_LT(std::fabs(gGrid.xi[p]), 1e-5f);
    gEddy = EddySettings{};
}

TEST(EddyViscosity, TheSmagorinskyFieldFollowsTheStrainOfTheFlow) {
    MakeCellBasin(0.25, 10);
    MakeChains();
    GridState& g = gGrid;
    EddySettings& e = gEddy;
    e.eddyType = 2;
    const float C = 0.5f;
    e.smagorinskyCoef.assign(g.Points(), C);
    e.eddyViscosity.assign(g.Points(), -1.0f);

    // A uniform flow has no strain: the field is 0, at the edges too.
    g.P.assign(g.Points(), 0.01f);
    g.Q.assign(g.Points(), 0.0f);
    CalcEddyViscosity();
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j) EXPECT_EQ(e.eddyViscosity[g.At(j, k)], 0.0f);

    // A shear u = s y: S12 = s, so nu/h = sqrt(s^2/2) dx^2 C^2 / h inside,
    // and at the rows beside the walls the one-sided strain is half of it.
    const float shear = 0.002f;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 0; j < g.J; ++j) g.P[g.At(j, k)] = shear * k;
    CalcEddyViscosity();
    const float inside = std::sqrt(0.5f) * shear * C * C;
    for (int32_t j = 2; j < g.J - 2; ++j) {
        EXPECT_NEAR(e.eddyViscosity[g.At(j, g.K / 2)], inside, 1e-6f * inside);
        EXPECT_NEAR(e.eddyViscosity[g.At(j, 1)], 0.5f * inside, 1e-6f * inside);
        // The edge rows copy their inner neighbours.
        EXPECT_EQ(e.eddyViscosity[g.At(j, 0)], e.eddyViscosity[g.At(j, 1)]);
        EXPECT_EQ(e.eddyViscosity[g.At(j, g.K)], e.eddyViscosity[g.At(j, g.K - 1)]);
    }
    // Half the coefficient and twice the depth: the strain halves, the
    // coefficient enters squared and the depth divides once more.
    e.smagorinskyCoef.assign(g.Points(), 0.5f * C);
    for (float& d : g.depth) d = 2.0f;
    CalcEddyViscosity();
    EXPECT_NEAR(e.eddyViscosity[g.At(g.J / 2, g.K / 2)], inside / 16.0f, 1e-5f * inside);
    gEddy = EddySettings{};
}

TEST(EddyViscosity, ASmagorinskyViscosityWearsACellDownAsTheStrainFalls) {
    const double dt = 0.25, a0 = 0.5;
    const int32_t steps = 2000;
    MakeCellBasin(dt, steps);
    gEddy.eddyType = 2;
    gEddy.smagorinskyCoef.assign(gGrid.Points(), 2.0f);
    gEddy.eddyViscosity.assign(gGrid.Points(), 0.0f);
    SetCell(a0);
    const std::vector<double> a = RunCell(steps);
    // nu grows with the amplitude, so dA/dt = -c A^2 and 1/A rises on a
    // straight line: its slope over the second half of the run matches the
    // first half's, where a constant viscosity would double it.
    const double r0 = 1.0 / a0, r1 = 1.0 / a[steps / 2 - 1], r2 = 1.0 / a.back();
    EXPECT_LT(a.back() / a0, 0.7);
    EXPECT_NEAR((r2 - r1) / (r1 - r0), 1.0, 0.03);
    gEddy = EddySettings{};
}

}  // namespace
