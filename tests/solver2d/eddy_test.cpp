// Eddy viscosity in a closed basin of 20 x 20 water points of 1 m, 1 m deep.
// A circulation of one cell, flat surface and no divergence, is steady but
// for the viscosity: a constant viscosity wears it down as exp(-nu k^2 t);
// with the Smagorinsky field the viscosity follows the strain, and 1/A grows
// linearly instead. The walls let the flow slip along them.
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

constexpr double kPi = std::numbers::pi, kLength = 20.0, kDt = 0.25;
constexpr int32_t kSteps = 2000;

// The stream function of the cell at the corner (x, y) between points.
double Psi(double x, double y, double a) {
    return a * std::sin(kPi * (x - 0.5) / kLength) * std::sin(kPi * (y - 0.5) / kLength);
}
// P = dpsi/dy on the face east of (j, k), as a difference of corners.
double CellP(int32_t j, int32_t k, double a) {
    return Psi(j + 0.5, k + 0.5, a) - Psi(j + 0.5, k - 0.5, a);
}

void MakeCellBasin(int32_t steps) {
    bwtest::BasinSpec s;
    s.J = s.K = static_cast<int32_t>(kLength) + 1;
    s.dt = kDt, s.steps = steps;
    bwtest::MakeBasin(s);
    gEddy = EddySettings{};
}

// Sets the cell of amplitude a0 (P and Q = -dpsi/dx as differences of psi,
// so that the discrete divergence is 0) and gives its amplitude in P, by
// projection, after each step.
std::vector<double> RunCell(double a0) {
    GridState& g = gGrid;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 1; j < g.J; ++j) {
            const size_t p = g.At(j, k);
            if (j < g.J - 1) g.P[p] = g.PPrev[p] = static_cast<float>(CellP(j, k, a0));
            if (k < g.K - 1)
                g.Q[p] = g.QPrev[p] =
                    static_cast<float>(Psi(j - 0.5, k + 0.5, a0) - Psi(j + 0.5, k + 0.5, a0));
        }
    std::vector<double> a;
    bwtest::RunSteps(kSteps, [&](int32_t) {
        double num = 0.0, den = 0.0;
        for (int32_t k = 1; k < g.K; ++k)
            for (int32_t j = 1; j < g.J - 1; ++j) {
                const double s = CellP(j, k, 1.0);
                num += s * g.P[g.At(j, k)], den += s * s;
            }
        a.push_back(num / den);
    });
    gEddy = EddySettings{};
    return a;
}

TEST(EddyViscosity, AConstantViscosityWearsACellDownAtTheRateOfTheDiffusion) {
    const double nu = 0.03, a0 = 1e-3;
    MakeCellBasin(kSteps);
    gEddy.eddyType = 1;
    gEddy.eddyViscosity.assign(gGrid.Points(), static_cast<float>(nu));
    const double measured = RunCell(a0).back() / a0;
    // k^2 of the discrete Laplacian, free slip at the walls; the cell falls to 0.48.
    const double k2 = 2.0 * (2.0 - 2.0 * std::cos(kPi / kLength));
    const double expected = std::exp(-nu * k2 * kSteps * kDt);
    EXPECT_NEAR(measured, expected, 0.01 * expected);
    for (size_t p = 0; p < gGrid.Points(); ++p)  // the surface stays flat
        EXPECT_LT(gGrid.bed[p] < 0.0f ? std::fabs(gGrid.xi[p]) : 0.0f, 1e-5f);
}

TEST(EddyViscosity, TheSmagorinskyFieldFollowsTheStrainOfTheFlow) {
    MakeCellBasin(10);
    MakeChains();
    GridState& g = gGrid;
    EddySettings& e = gEddy;
    e.eddyType = 2;
    const float C = 0.5f;
    e.smagorinskyCoef.assign(g.Points(), C);
    e.eddyViscosity.assign(g.Points(), -1.0f);
    // A uniform flow has no strain: 0 everywhere, the edges too.
    g.P.assign(g.Points(), 0.01f);
    g.Q.assign(g.Points(), 0.0f);
    CalcEddyViscosity();
    for (float nu : e.eddyViscosity) EXPECT_EQ(nu, 0.0f);
    // A shear u = s y: S12 = s, so nu/h = sqrt(s^2/2) dx^2 C^2 / h inside, and
    // the one-sided strain beside the walls is half of it; the edge rows copy
    // their inner neighbours.
    const float shear = 0.002f;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 0; j < g.J; ++j) g.P[g.At(j, k)] = shear * k;
    CalcEddyViscosity();
    const float inside = std::sqrt(0.5f) * shear * C * C;
    for (int32_t j = 2; j < g.J - 2; ++j) {
        EXPECT_NEAR(e.eddyViscosity[g.At(j, g.K / 2)], inside, 1e-6f * inside);
        EXPECT_NEAR(e.eddyViscosity[g.At(j, 1)], 0.5f * inside, 1e-6f * inside);
        EXPECT_EQ(e.eddyViscosity[g.At(j, 0)], e.eddyViscosity[g.At(j, 1)]);
        EXPECT_EQ(e.eddyViscosity[g.At(j, g.K)], e.eddyViscosity[g.At(j, g.K - 1)]);
    }
    // Half the coefficient (squared) and twice the depth (divides twice).
    e.smagorinskyCoef.assign(g.Points(), 0.5f * C);
    for (float& d : g.depth) d = 2.0f;
    CalcEddyViscosity();
    EXPECT_NEAR(e.eddyViscosity[g.At(g.J / 2, g.K / 2)], inside / 16.0f, 1e-5f * inside);
    gEddy = EddySettings{};
}

TEST(EddyViscosity, ASmagorinskyViscosityWearsACellDownAsTheStrainFalls) {
    const double a0 = 0.5;
    MakeCellBasin(kSteps);
    gEddy.eddyType = 2;
    gEddy.smagorinskyCoef.assign(gGrid.Points(), 2.0f);
    gEddy.eddyViscosity.assign(gGrid.Points(), 0.0f);
    const std::vector<double> a = RunCell(a0);
    // dA/dt = -c A^2: 1/A rises on a straight line, its slope over the second
    // half of the run the first half's (a constant viscosity would double it).
    const double r0 = 1.0 / a0, r1 = 1.0 / a[kSteps / 2 - 1], r2 = 1.0 / a.back();
    EXPECT_LT(a.back() / a0, 0.7);
    EXPECT_NEAR((r2 - r1) / (r1 - r0), 1.0, 0.03);
}

}  // namespace
