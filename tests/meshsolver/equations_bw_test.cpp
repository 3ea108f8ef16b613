// The Boussinesq element equations: the element matrices against the closed
// forms of the quadratic and linear line elements, the slope term and dry
// elements; the rates of still water; and the stage update (walls,
// auxiliary variable).
#include <gtest/gtest.h>

#include <cmath>
#include <numbers>

#include "equations_flume.hpp"
#include "meshsolver/processes_bw.hpp"

namespace {

using bwtest::BuildFlume;
using bwtest::StartFlume;

// Quadratic line element, nodes in the order left, right, middle: the mass
// matrix is L/30 kMass and the stiffness matrix 1/(3L) kStiff.
constexpr double kMass[3][3] = {{4, -1, 2}, {-1, 4, 2}, {2, 2, 16}};
constexpr double kStiff[3][3] = {{7, 1, -8}, {1, 7, -8}, {-8, -8, 16}};
constexpr int32_t kNode[3] = {1, 3, 2};  // flux nodes of the first element

TEST(ElementMatrices, ClosedFormsSlopeTermAndDryElement) {
    // One element of length 2, flat bed of depth 1.5: A is the mass plus
    // (beta + 1/3) d^2 times the stiffness; B is L/6 [2 1; 1 2].
    const double L = 2.0, d = 1.5, beta = 0.1;
    BwModel& m = BuildFlume(
        1, L, [&](double) { return d; }, 2, beta, 0.1);
    m.VelocitySet.records.clear();  // no identity rows
    CalcMatricesBW(m);
    for (int p = 0; p < 3; ++p)
        for (int s = 0; s < 3; ++s)
            EXPECT_NEAR(
                BandEntry(m.Les.FluxMatrix.Matrix, kNode[p], kNode[s]),
                L / 30.0 * kMass[p][s] + (beta + 1.0 / 3.0) * d * d / (3.0 * L) * kStiff[p][s],
                1e-13)
                << p << " " << s;
    const BandMatrix& B = m.Les.ElevationMatrix.Matrix;
    EXPECT_NEAR(BandEntry(B, 1, 1), L / 3.0, 1e-14);
    EXPECT_NEAR(BandEntry(B, 1, 2), L / 6.0, 1e-14);
    EXPECT_NEAR(BandEntry(B, 2, 1), L / 6.0, 1e-14);

    // On the slope d = 1 + x over 0..1 and for P = x, A P is int N_p x +
    // (beta + 1/3) int d^2 N_p' + (2 beta + 1/3) int d d_x N_p: the term
    // (beta + 1/3) d^2 P_xxt by parts together with (1/3) d d_x P_xt.
    const double b = 0.05;
    BwModel& slope = BuildFlume(
        1, 1.0, [](double x) { return 1.0 + x; }, 2, b, 0.1);
    slope.VelocitySet.records.clear();
    CalcMatricesBW(slope);
    const double x[3] = {0.0, 1.0, 0.5};
    const double intNx[3] = {0.0, 1.0 / 6.0, 1.0 / 3.0};
    const double intD2dN[3] = {-4.0 / 3.0, 10.0 / 3.0, -2.0};
    const double intDN[3] = {1.0 / 6.0, 1.0 / 3.0, 1.0};
    for (int p = 0; p < 3; ++p) {
        double ax = 0.0;
        for (int s = 0; s < 3; ++s)
            ax += BandEntry(slope.Les.FluxMatrix.Matrix, kNode[p], kNode[s]) * x[s];
        EXPECT_NEAR(ax, intNx[p] + (b + 1.0 / 3.0) * intD2dN[p] + (2.0 * b + 1.0 / 3.0) * intDN[p],
                    1e-13)
            << p;
    }

    // A dry node switches the dispersion of its element off: A is the mass.
    BwModel& dry = BuildFlume(
        1, 3.0, [](double x) { return 0.5 - x; }, 1, 0.0, 0.1);
    dry.VelocitySet.records.clear();
    CalcMatricesBW(dry);
    for (int p = 0; p < 3; ++p)
        for (int s = 0; s < 3; ++s)
            EXPECT_NEAR(BandEntry(dry.Les.FluxMatrix.Matrix, kNode[p], kNode[s]),
                        3.0 / 30.0 * kMass[p][s], 1e-14);
}

TEST(ElementRhs, StillWaterStaysStillWithEveryTermOn) {
    // Rest on a sloping bed with porosity, friction, enhanced dispersion and
    // the stabilising term: no rate anywhere (P bar is 0, no division by 0).
    int32_t status = 0;
    BwModel& still = BuildFlume(
        6, 6.0, [](double x) { return 2.0 - 0.2 * x; }, 2, 1.0 / 15.0, 0.1);
    for (double& n : still.Porosity) n = 0.6;
    for (double& r : still.Resistance) r = 0.01;
    still.resistanceType = 3;
    still.porosityAlpha = 0.035;
    still.porosityBeta = 14.0;
    still.typeOfSupg = -1;
    still.supgCoefficient = 0.5;
    StartFlume(still, [](double) { return 0.0; });
    CalcRhsBW(0.0, 0.1, still.Dae.y, still.Dae.ydot, still, status);
    EXPECT_EQ(status, 0);
    for (int32_t i = 1; i <= still.StateSize; ++i) EXPECT_EQ(still.Dae.ydot[i], 0.0) << i;
}

TEST(StageUpdate, WallsAndAuxiliaryVariable) {
    // After a stage the walls hold no flux and the auxiliary variable is
    // (d eta_x)_x of a cosine on a flat bed: with the consistent mass of the
    // linear element a sampled cosine is an exact discrete mode, e = -d eta
    // 6 (2 - 2 cos kh) / (h^2 (4 + 2 cos kh)), walls included.
    const double d = 2.0, a = 0.01, k = 2.0 * std::numbers::pi / 10.0;
    BwModel& m = BuildFlume(
        10, 10.0, [&](double) { return d; }, 2, 1.0 / 15.0, 0.1);
    StartFlume(m, [&](double x) { return a * std::cos(k * x); });
    std::vector<double>& y = m.Dae.y;
    y[1] = 0.4;
    y[21] = -0.2;
    y[10] = 0.125;
    int32_t status = 0;
    UpdateStageBW(0.0, 0.1, y, m, status);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(y[1], 0.0);
    EXPECT_EQ(y[21], 0.0);
    EXPECT_EQ(m.Flux[10], 0.125);
    const Mesh& line = gMeshes.meshes[1];
    const double c = std::cos(k * 1.0), mode = 6.0 * (2.0 - 2.0 * c) / (4.0 + 2.0 * c);
    for (int32_t i = 1; i <= 11; ++i) {
        EXPECT_NEAR(m.AuxVariable[i], -d * mode * a * std::cos(k * line.x[i]), 1e-12) << i;
        EXPECT_DOUBLE_EQ(m.TotalDepth[i], d + y[m.ElevationStart + i - 1]);
    }
}

}  // namespace
