// The Boussinesq element equations: the element matrices against the
// closed forms of the quadratic and linear line elements, the treatment of
// dry elements and of a generation line, and small runs in a closed flume
// against the linear theory of the equations (period of a standing wave for
// classical and enhanced dispersion, conservation of volume) with the
// observed orders of convergence in time and space.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <numbers>

#include "equations_flume.hpp"
#include "meshsolver/processes_bw.hpp"

namespace {

using bwtest::BuildFlume;
using bwtest::StartFlume;

constexpr double kPi = std::numbers::pi;

double Flat(double) {
    return 1.0;
}

// Entries of a band matrix for nodes a..c of one element.
double Entry(const BandMatrix& m, int32_t i, int32_t j) {
    return BandEntry(m, i, j);
}

TEST(ElementMatrices, SingleElementMatchesClosedForms) {
    // One element of length 2 on a flat bed of depth 1.5, beta 0.1: A is the
    // quadratic mass matrix L/30 [4 -1 2; -1 4 2; 2 2 16] plus
    // (beta + 1/3) d^2 times the stiffness 1/(3L) [7 1 -8; 1 7 -8; -8 -8 16];
    // B is L/6 [2 1; 1 2].
    const double L = 2.0, d = 1.5, beta = 0.1;
    BwModel& m = BuildFlume(
        1, L, [&](double) { return d; }, 2, beta, 0.1);
    m.VelocitySet.records.clear();  // no identity rows
    CalcMatricesBW(m);
    const double mass[3][3] = {{4, -1, 2}, {-1, 4, 2}, {2, 2, 16}};
    const double stiff[3][3] = {{7, 1, -8}, {1, 7, -8}, {-8, -8, 16}};
    const int32_t node[3] = {1, 3, 2};  // left, right, middle
    const BandMatrix& A = m.Les.FluxMatrix.Matrix;
    for (int p = 0; p < 3; ++p)
        for (int s = 0; s < 3; ++s)
            EXPECT_NEAR(
                Entry(A, node[p], node[s]),
                L / 30.0 * mass[p][s] + (beta + 1.0 / 3.0) * d * d / (3.0 * L) * stiff[p][s], 1e-13)
                << p << " " << s;
    const BandMatrix& B = m.Les.ElevationMatrix.Matrix;
    EXPECT_NEAR(Entry(B, 1, 1), L / 3.0, 1e-14);
    EXPECT_NEAR(Entry(B, 1, 2), L / 6.0, 1e-14);
    EXPECT_NEAR(Entry(B, 2, 1), L / 6.0, 1e-14);
}

TEST(ElementMatrices, SlopeTermAndDryElementAndWallRows) {
    // On the slope d = 1 + x over 0..1 and for the flux P = x (P_x = 1), A P
    // is int N_p x + (beta + 1/3) int d^2 N_p' + (2 beta + 1/3) int d d_x N_p:
    // the term (beta + 1/3) d^2 P_xxt by parts together with (1/3) d d_x P_xt.
    const double beta = 0.05;
    BwModel& m = BuildFlume(
        1, 1.0, [](double x) { return 1.0 + x; }, 2, beta, 0.1);
    m.VelocitySet.records.clear();
    CalcMatricesBW(m);
    const BandMatrix& A = m.Les.FluxMatrix.Matrix;
    const int32_t node[3] = {1, 3, 2};
    const double x[3] = {0.0, 1.0, 0.5};
    // With N1 = (1 - x)(1 - 2x), N2 = x (2x - 1), N3 = 4x (1 - x):
    const double intNx[3] = {0.0, 1.0 / 6.0, 1.0 / 3.0};
    const double intD2dN[3] = {-4.0 / 3.0, 10.0 / 3.0, -2.0};
    const double intDN[3] = {1.0 / 6.0, 1.0 / 3.0, 1.0};
    for (int p = 0; p < 3; ++p) {
        double ax = 0.0;
        for (int s = 0; s < 3; ++s) ax += Entry(A, node[p], node[s]) * x[s];
        EXPECT_NEAR(
            ax, intNx[p] + (beta + 1.0 / 3.0) * intD2dN[p] + (2.0 * beta + 1.0 / 3.0) * intDN[p],
            1e-13)
            << p;
    }
    const double mass[3][3] = {{4, -1, 2}, {-1, 4, 2}, {2, 2, 16}};
    // A dry node switches the dispersion of its element off: A is the mass.
    BwModel& dry = BuildFlume(
        1, 3.0, [](double x) { return 0.5 - x; }, 1, 0.0, 0.1);
    dry.VelocitySet.records.clear();
    CalcMatricesBW(dry);
    // Porosity 1: the mass matrix of the quadratic element alone.
    for (int p = 0; p < 3; ++p)
        for (int s = 0; s < 3; ++s)
            EXPECT_NEAR(Entry(dry.Les.FluxMatrix.Matrix, node[p], node[s]), 3.0 / 30.0 * mass[p][s],
                        1e-14);
    // Walls: identity rows at both ends of the flux mesh.
    BwModel& walls = BuildFlume(3, 3.0, Flat, 1, 0.0, 0.1);
    CalcMatricesBW(walls);
    const BandMatrix& W = walls.Les.FluxMatrix.Matrix;
    EXPECT_EQ(Entry(W, 1, 1), 1.0);
    EXPECT_EQ(Entry(W, 1, 2), 0.0);
    EXPECT_EQ(Entry(W, 1, 3), 0.0);
    EXPECT_EQ(Entry(W, 7, 7), 1.0);
    EXPECT_EQ(Entry(W, 7, 6), 0.0);
    EXPECT_NE(Entry(W, 2, 1), 0.0);  // the columns stay
}

TEST(ElementRhs, GenerationNodeIsASourceOfTwiceItsFlux) {
    // A generation line at the middle corner node of a flume at rest: the
    // surface rates, weighted by the elevation matrix, add up to 2 Q, half
    // to each side; the flux rates are symmetric about the node.
    const double Q = 0.3;
    BwModel& m = BuildFlume(4, 4.0, Flat, 1, 0.0, 0.5);
    bwtest::AddRecord(m.VelocitySet, 5, kNodeGeneration, 1.0);
    m.VelocitySet.records.back().Value[0] = Q;
    m.VelocitySet.records.back().Value[1] = Q;
    m.VelocitySet.time = 1.0;
    StartFlume(m, [](double) { return 0.0; });
    std::vector<double>& y = m.Dae.y;
    std::vector<double>& ydot = m.Dae.ydot;
    CalcElementRhsBW(0.75, y, m, ydot);
    double source = 0.0;
    for (int32_t i = 1; i <= 5; ++i) source += ydot[m.ElevationStart + i - 1];
    EXPECT_NEAR(source, 2.0 * Q, 1e-14);
    // Symmetric about the source, which feeds both neighbours; the walls
    // see nothing yet.
    EXPECT_NEAR(ydot[m.ElevationStart + 2 - 1], ydot[m.ElevationStart + 4 - 1], 1e-14);
    EXPECT_GT(ydot[m.ElevationStart + 2 - 1], 0.0);
    EXPECT_GT(ydot[m.ElevationStart + 3 - 1], ydot[m.ElevationStart + 2 - 1]);
    EXPECT_EQ(ydot[m.ElevationStart], 0.0);
    EXPECT_EQ(ydot[m.ElevationStart + 4], 0.0);
    // The rates after the solves keep the volume rate: B is a mass matrix.
    int32_t status = 0;
    CalcRhsBW(0.75, 0.25, y, ydot, m, status);
    double rate = 0.0;
    for (int32_t i = 1; i <= 4; ++i)
        rate += 0.5 * (ydot[m.ElevationStart + i - 1] + ydot[m.ElevationStart + i]);
    EXPECT_NEAR(rate, 2.0 * Q, 1e-12);
    EXPECT_EQ(ydot[1], 0.0);  // wall rows
    EXPECT_EQ(ydot[9], 0.0);
    for (int32_t i = 1; i <= 5; ++i) EXPECT_EQ(m.ElevationRate[i], ydot[m.ElevationStart + i - 1]);
}

TEST(ElementRhs, StillWaterStaysStillWithEveryTermOn) {
    // Rest on a sloping bed with porosity, friction, enhanced dispersion and
    // the stabilising term: no rate anywhere (P bar is 0, no division by 0).
    BwModel& m = BuildFlume(
        6, 6.0, [](double x) { return 2.0 - 0.2 * x; }, 2, 1.0 / 15.0, 0.1);
    for (double& n : m.Porosity) n = 0.6;
    for (double& r : m.Resistance) r = 0.01;
    m.resistanceType = 3;
    m.porosityAlpha = 0.035;
    m.porosityBeta = 14.0;
    m.typeOfSupg = -1;
    m.supgCoefficient = 0.5;
    StartFlume(m, [](double) { return 0.0; });
    int32_t status = 0;
    CalcRhsBW(0.0, 0.1, m.Dae.y, m.Dae.ydot, m, status);
    EXPECT_EQ(status, 0);
    for (int32_t i = 1; i <= m.StateSize; ++i) EXPECT_EQ(m.Dae.ydot[i], 0.0) << i;
}

TEST(StageUpdate, WallsAuxiliaryVariableAndBlowUp) {
    // After a stage the walls hold no flux, the auxiliary variable is
    // (d eta_x)_x of a cosine on a flat bed: with the consistent mass of the
    // linear element, C e = K eta, a sampled cosine is an exact discrete
    // mode, e = -d eta 6 (2 - 2 cos kh) / (h^2 (4 + 2 cos kh)), which tends to
    // -d k^2 eta; the walls included. The copies follow y.
    const double d = 2.0, a = 0.01, k = 2.0 * kPi / 10.0;
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
    for (int32_t i = 1; i <= 11; ++i)
        EXPECT_NEAR(m.AuxVariable[i], -d * mode * a * std::cos(k * line.x[i]), 1e-12) << i;
    for (int32_t i = 1; i <= 11; ++i)
        EXPECT_DOUBLE_EQ(m.TotalDepth[i], d + y[m.ElevationStart + i - 1]);
    // A surface above 50 ends the stage before the copies.
    y[m.ElevationStart + 4] = 60.0;
    y[10] = 0.5;
    UpdateStageBW(0.0, 0.1, y, m, status);
    EXPECT_EQ(status, -1);
    EXPECT_EQ(m.Flux[10], 0.125);
    EXPECT_NE(m.Elevation[5], 60.0);
}

// A standing wave of one wavelength between the walls of a flat flume of
// depth 1, from rest: the period from the zero crossings of the surface at
// the first node, and the largest drift of the volume.
struct StandingWave {
    double period = 0.0, theory = 0.0, volumeDrift = 0.0, waterVolume = 0.0;
    int32_t status = 0;
};

StandingWave RunStandingWave(double kd, int32_t formulation, double beta, int32_t elements,
                             int32_t stepsPerPeriod, int32_t periods, double amplitude) {
    const double d = 1.0, k = kd / d, length = 2.0 * kPi / k;
    StandingWave w;
    w.theory = 2.0 * kPi / bwtest::TheoryOmega(k, d, beta);
    const double dt = w.theory / stepsPerPeriod;
    BwModel& m = BuildFlume(
        elements, length, [&](double) { return d; }, formulation, beta, dt);
    StartFlume(m, [&](double x) { return amplitude * std::cos(k * x); });
    const double v0 = bwtest::SurfaceVolume(m);
    w.waterVolume = d * length;
    double previous = m.Elevation[1], first = -1.0, last = -1.0;
    int32_t crossings = 0;
    for (int32_t s = 1; s <= periods * stepsPerPeriod; ++s) {
        SolveTimeStepBW(s * dt, m, w.status);
        if (w.status != 0) return w;
        const double now = m.Elevation[1];
        if ((previous > 0.0) != (now > 0.0)) {
            const double t = (s - 1) * dt + dt * previous / (previous - now);
            if (crossings == 0) first = t;
            last = t;
            ++crossings;
        }
        previous = now;
        w.volumeDrift = std::max(w.volumeDrift, std::abs(bwtest::SurfaceVolume(m) - v0));
    }
    w.period = crossings > 1 ? 2.0 * (last - first) / (crossings - 1) : 0.0;
    return w;
}

TEST(Flume, StandingWavePeriodFollowsTheLinearDispersion) {
    struct Case {
        int32_t formulation;
        double beta;
    };
    for (const Case c : {Case{1, 0.0}, Case{2, 1.0 / 15.0}}) {
        for (const double kd : {0.3, 1.0, 2.0, 3.0}) {
            const StandingWave w = RunStandingWave(kd, c.formulation, c.beta, 24, 100, 3, 1.0e-4);
            ASSERT_EQ(w.status, 0);
            const double error = (w.period - w.theory) / w.theory;
            std::printf("standing wave B = %.4f kd = %.1f: period error %+.2e, volume drift %.1e\n",
                        c.beta, kd, error, w.volumeDrift / w.waterVolume);
            EXPECT_LT(std::abs(error), 3.0e-3) << "B " << c.beta << " kd " << kd;
            EXPECT_LT(w.volumeDrift, 1.0e-6 * w.waterVolume) << "B " << c.beta << " kd " << kd;
        }
    }
}

// The surface after one period of the standing wave (kd = 1, 16 elements
// over the wavelength) with the given number of steps in the period.
std::vector<double> SurfaceAfterOnePeriod(int32_t formulation, double beta, int32_t steps) {
    const double k = 1.0, length = 2.0 * kPi / k;
    const double period = 2.0 * kPi / bwtest::TheoryOmega(k, 1.0, beta);
    const double dt = period / steps;
    BwModel& m = BuildFlume(16, length, Flat, formulation, beta, dt);
    StartFlume(m, [&](double x) { return 1.0e-3 * std::cos(k * x); });
    int32_t status = 0;
    for (int32_t s = 1; s <= steps && status == 0; ++s) SolveTimeStepBW(s * dt, m, status);
    EXPECT_EQ(status, 0);
    return m.Elevation;
}

double MaxDifference(const std::vector<double>& a, const std::vector<double>& b) {
    double e = 0.0;
    for (size_t i = 1; i < a.size(); ++i) e = std::max(e, std::abs(a[i] - b[i]));
    return e;
}

TEST(Flume, ThirdOrderInTime) {
    // Halving the step from 10 to 40 steps a period, against 640 steps.
    for (const int32_t formulation : {1, 2}) {
        const double beta = formulation == 2 ? 1.0 / 15.0 : 0.0;
        const std::vector<double> reference = SurfaceAfterOnePeriod(formulation, beta, 640);
        double error[3];
        for (int r = 0; r < 3; ++r)
            error[r] = MaxDifference(SurfaceAfterOnePeriod(formulation, beta, 10 << r), reference);
        const double order1 = std::log2(error[0] / error[1]),
                     order2 = std::log2(error[1] / error[2]);
        std::printf("time, B = %.4f: errors %.3e %.3e %.3e, orders %.2f %.2f\n", beta, error[0],
                    error[1], error[2], order1, order2);
        EXPECT_GT(order2, 2.7);
        EXPECT_LT(order2, 3.5);
    }
}

TEST(Flume, SpatialConvergenceOfThePeriod) {
    // The period of the standing wave (kd = 1 and 2) with 4, 8 and 16
    // elements over the wavelength; 400 steps a period leave the time error
    // far below.
    for (const int32_t formulation : {1, 2}) {
        const double beta = formulation == 2 ? 1.0 / 15.0 : 0.0;
        for (const double kd : {1.0, 2.0}) {
            double error[3];
            for (int r = 0; r < 3; ++r) {
                const StandingWave w =
                    RunStandingWave(kd, formulation, beta, 4 << r, 400, 2, 1.0e-6);
                ASSERT_EQ(w.status, 0);
                error[r] = std::abs(w.period - w.theory) / w.theory;
            }
            const double order1 = std::log2(error[0] / error[1]);
            const double order2 = std::log2(error[1] / error[2]);
            std::printf(
                "space, B = %.4f kd = %.0f: period errors %.3e %.3e %.3e, orders %.2f %.2f\n", beta,
                kd, error[0], error[1], error[2], order1, order2);
            EXPECT_GT(order2, 1.8);
        }
    }
}

}  // namespace
