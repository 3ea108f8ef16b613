// The physics of the 1DH mesh solver in small runs against the linear
// theory of the equations: waves sent in at the left end of a long flume
// through the boundary codes the model file gives (a level boundary and a
// flux boundary both become flux boundaries of the mesh solver) travel at
// the celerity and with the wavelength of the dispersion relation, for
// classical and enhanced dispersion; and the same flume run by the 1DH and
// the 2DH solver gives the same standing-wave period and the same
// wavelength of a driven wave.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <numbers>
#include <string>
#include <vector>

#include "equations/time_integrators.hpp"
#include "equations_flume.hpp"
#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "meshsolver/boundary_bw.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "platform/kvt/kvt.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

constexpr double kPi = std::numbers::pi;
constexpr double kOneFifteenth = 1.0 / 15.0;

// The wavelength from the crossings of a profile: twice the mean distance
// between successive crossings (both directions), 0 with fewer than three.
double WavelengthOf(const std::vector<double>& crossings) {
    if (crossings.size() < 3) return 0.0;
    return 2.0 * (crossings.back() - crossings.front()) / static_cast<double>(crossings.size() - 1);
}

// The fit of v(t) = A cos(omega t) + B sin(omega t) + C to samples v[i] at
// t = origin + i step that span whole periods: amplitude sqrt(A^2 + B^2)
// and phase atan2(B, A), v = R cos(omega t - phase) + C.
struct Harmonic {
    double amplitude = 0.0, phase = 0.0;
};
Harmonic FitHarmonic(const std::vector<double>& v, double origin, double step, double omega) {
    double A = 0.0, B = 0.0;
    const double n = static_cast<double>(v.size());
    for (size_t i = 0; i < v.size(); ++i) {
        const double t = origin + static_cast<double>(i) * step;
        A += 2.0 / n * v[i] * std::cos(omega * t);
        B += 2.0 / n * v[i] * std::sin(omega * t);
    }
    return {std::hypot(A, B), std::atan2(B, A)};
}

// ---------------------------------------------------------------------------
// A wave sent in at the left end of a flat flume in 1 m of water.

struct DrivenWave {
    double theoryK = 0.0, theoryC = 0.0;
    double celerity = 0.0;    // from the phase shift between two gauges
    double wavelength = 0.0;  // from the surface along the line at the last step
    double amplitude = 0.0;   // at the first gauge
    int32_t status = 0;
    std::vector<double> surface;  // at the end
};

// A flume of 12 wavelengths at `perWavelength` elements a wavelength and
// `perPeriod` steps a period T, the wave number kd in 1 m of water. Its
// left end carries code 2 and its right end code 3, the codes the model
// reader gives a line with a boundary at its first point, both of the code
// type of that boundary (3 from a level boundary, 4 from a flux boundary).
// Code 2 reads a series file with the flux a c sin(omega t) as item 1 and
// the surface slope of the wave there, -k a cos(omega t), as item 2 (the
// enhanced equations need it for the auxiliary variable), soft started over
// two periods; code 3 has no data: a wall. Gauges one and two wavelengths
// in, fitted over 6 T to 9 T; the wavelength along 0.5 to 2.5 wavelengths
// at 9 T. The fastest disturbance, sqrt(g d), is 10 wavelengths in by then
// and the far wall's reflection comes back long after.
DrivenWave RunDrivenWave(int32_t codeType, int32_t formulation, double beta, double kd,
                         int32_t perWavelength, int32_t perPeriod, const bwtest::TempDir& dir) {
    const double d = 1.0, k = kd / d, a = 1.0e-3;
    const double omega = bwtest::TheoryOmega(k, d, beta), T = 2.0 * kPi / omega;
    const double lambda = 2.0 * kPi / k, dt = T / perPeriod;
    const int32_t wavelengths = 12, periods = 9, steps = periods * perPeriod;
    DrivenWave w;
    w.theoryK = k;
    w.theoryC = omega / k;

    BwModel& m = bwtest::BuildFlume(
        wavelengths * perWavelength, wavelengths * lambda, [&](double) { return d; }, formulation,
        beta, dt);
    // The codes of the ends, then the boundary sets as the driver reads them.
    Mesh& line = gMeshes.meshes[1];
    Mesh& flux = gMeshes.meshes[2];
    line.code[line.NodeCount] = 3;
    flux.code[flux.NodeCount] = 3;
    SetupMeshTopology(line);
    SetupMeshTopology(flux);

    gMeshRun = MeshRunState{};
    gMeshRun.StartDate = MakeDateTime(2004, 1, 1, 0, 0, 0);
    gMeshRun.TimeStepInterval = dt;
    gMeshRun.LastStep = steps;
    std::vector<float> series(steps + 2), slope(steps + 2);
    for (size_t n = 0; n < series.size(); ++n) {
        series[n] = static_cast<float>(a * w.theoryC * std::sin(omega * n * dt));
        slope[n] = static_cast<float>(-k * a * std::cos(omega * n * dt));
    }
    const std::string seriesFile = dir / "q.xol0", solverFile = dir / "s.kvt";
    bwtest::WriteSeriesFile(seriesFile, "2004-01-01 00:00:00", dt, {series, slope});
    const std::string type = std::to_string(codeType);
    char soft[64];
    std::snprintf(soft, sizeof soft, "soft_time_interval = %.17g\n", 2.0 * T);
    bwtest::WriteFile(solverFile,
                      "MeshSolverBW {\nBOUSSINESQ_WAVE_MODULE {\nBOUNDARY_CONDITIONS {\n"
                      "CODE_2 {\ntype = " +
                          type + "\nformat = 1\n" + soft + "file_name = \"" + seriesFile +
                          "\"\nitem_numbers = 1, 2\n}\nCODE_3 {\ntype = " + type +
                          "\nformat = 0\n" + soft + "}\n}\n}\n}\n");
    testing::internal::CaptureStdout();
    KvtHandle file = KvtOpenFile(solverFile, false);
    KvtUseFile(file);
    KvtOpenTarget("MeshSolverBW");
    KvtOpenSection("BOUSSINESQ_WAVE_MODULE");
    SetupBoundCondBW(m);
    KvtCloseSection();
    kvtClose(&file);
    testing::internal::GetCapturedStdout();

    bwtest::StartFlume(m, [](double) { return 0.0; });
    UpdateForcingsBW(0.0, m);
    const int32_t gauge1 = perWavelength + 1, gauge2 = 2 * perWavelength + 1;  // linear nodes
    const int32_t from = 6 * perPeriod;
    std::vector<double> h1, h2;
    for (int32_t s = 1; s <= steps; ++s) {
        SolveTimeStepBW(s * dt, m, w.status);
        if (w.status != 0) return w;
        if (s > from) {
            h1.push_back(m.Elevation[gauge1]);
            h2.push_back(m.Elevation[gauge2]);
        }
    }
    // Over whole periods the fit of A cos + B sin + C separates the wave
    // from the still level that the soft start leaves behind the front.
    const Harmonic p1 = FitHarmonic(h1, (from + 1) * dt, dt, omega);
    const Harmonic p2 = FitHarmonic(h2, (from + 1) * dt, dt, omega);
    const double distance = line.x[gauge2] - line.x[gauge1];
    double shift = p2.phase - p1.phase;
    const double expected = k * distance;
    shift += 2.0 * kPi * std::round((expected - shift) / (2.0 * kPi));
    w.celerity = omega * distance / shift;
    w.amplitude = p1.amplitude;

    std::vector<double> profile;
    const int32_t first = perWavelength / 2 + 1, last = first + 2 * perWavelength;
    double mean = 0.0;
    for (int32_t i = first; i <= last; ++i) profile.push_back(m.Elevation[i]);
    for (int32_t i = first; i < last; ++i) mean += 0.5 * (m.Elevation[i] + m.Elevation[i + 1]);
    mean /= last - first;
    for (double& v : profile) v -= mean;
    w.wavelength = WavelengthOf(bwtest::ZeroCrossings(profile, lambda / perWavelength));
    w.surface.assign(m.Elevation.begin() + 1, m.Elevation.end());
    return w;
}

TEST(DrivenWave, LevelAndFluxBoundariesSendWavesAtTheCelerityOfTheRelation) {
    bwtest::TempDir dir;
    struct Case {
        int32_t formulation;
        double beta, kd;
    };
    for (const Case c :
         {Case{1, 0.0, 1.0}, Case{2, kOneFifteenth, 1.0}, Case{2, kOneFifteenth, 2.0}}) {
        std::vector<double> surfaceOfType[2];
        for (const int32_t codeType : {3, 4}) {
            SCOPED_TRACE(testing::Message()
                         << "code type " << codeType << " B " << c.beta << " kd " << c.kd);
            const DrivenWave w = RunDrivenWave(codeType, c.formulation, c.beta, c.kd, 24, 100, dir);
            ASSERT_EQ(w.status, 0);
            const double lambda = 2.0 * kPi / w.theoryK;
            std::printf(
                "driven wave, code type %d, B = %.4f, kd = %.1f: celerity %+.2e, "
                "wavelength %+.2e, amplitude %+.2e (relative errors)\n",
                codeType, c.beta, c.kd, w.celerity / w.theoryC - 1.0, w.wavelength / lambda - 1.0,
                w.amplitude / 1.0e-3 - 1.0);
            EXPECT_NEAR(w.celerity / w.theoryC, 1.0, 0.01);
            EXPECT_NEAR(w.wavelength / lambda, 1.0, 0.01);
            EXPECT_NEAR(w.amplitude / 1.0e-3, 1.0, 0.05);
            surfaceOfType[codeType - 3] = w.surface;
        }
        // A level boundary of the model file is a flux boundary here: the
        // same series gives the same run.
        EXPECT_EQ(surfaceOfType[0], surfaceOfType[1]);
    }
}

// ---------------------------------------------------------------------------
// The same flume in the 1DH and the 2DH solver.

double StandingPeriod1DH(int32_t formulation, double beta, double kd, int32_t elements,
                         int32_t stepsPerPeriod);

// Period of the standing wave of one wavelength (wave number kd in 1 m of
// water) between the walls of a closed flume, from the zero crossings of the
// surface next to the left wall over three periods.
double StandingPeriod1DH(int32_t formulation, double beta, double kd, int32_t elements,
                         int32_t stepsPerPeriod) {
    const double k = kd, L = 2.0 * kPi / k;
    const double T = 2.0 * kPi / bwtest::TheoryOmega(k, 1.0, beta), dt = T / stepsPerPeriod;
    BwModel& m = bwtest::BuildFlume(
        elements, L, [](double) { return 1.0; }, formulation, beta, dt);
    bwtest::StartFlume(m, [&](double x) { return 1.0e-3 * std::cos(k * x); });
    std::vector<double> h{m.Elevation[1]};
    int32_t status = 0;
    for (int32_t s = 1; s <= 3 * stepsPerPeriod && status == 0; ++s) {
        SolveTimeStepBW(s * dt, m, status);
        h.push_back(m.Elevation[1]);
    }
    EXPECT_EQ(status, 0);
    const std::vector<double> z = bwtest::ZeroCrossings(h, dt);
    return z.size() < 2 ? 0.0 : 2.0 * (z.back() - z.front()) / static_cast<double>(z.size() - 1);
}

// The same in a 2DH basin three water points wide with land on all sides:
// `cells` water points along the flume, the walls at the faces beside the
// land, the period from the first water point of the middle row.
double StandingPeriod2DH(bool deep, int32_t cells, int32_t stepsPerPeriod) {
    const double k = 1.0, L = 2.0 * kPi / k;
    const double B = deep ? static_cast<double>(1.0f / 15.0f) : 0.0;
    const double T = 2.0 * kPi / std::sqrt(bwtest::Omega2(k, 1.0, B));
    bwtest::BasinSpec s;
    s.dx = s.dy = static_cast<float>(L / cells);
    s.J = cells + 1, s.K = 4;
    s.dt = T / stepsPerPeriod, s.steps = 3 * stepsPerPeriod, s.deepWater = deep;
    bwtest::MakeBasin(s);
    const double x0 = 0.5 * s.dx;
    bwtest::SetSurface(
        [&](float x, float) { return static_cast<float>(1.0e-3 * std::cos(k * (x - x0))); });
    const size_t point = gGrid.At(1, 2);
    std::vector<double> h{gGrid.xi[point]};
    bwtest::RunSteps(s.steps, [&](int32_t) { h.push_back(gGrid.xi[point]); });
    const std::vector<double> z = bwtest::ZeroCrossings(h, s.dt);
    return z.size() < 2 ? 0.0 : 2.0 * (z.back() - z.front()) / static_cast<double>(z.size() - 1);
}

TEST(SameFlume, OneAndTwoDimensionalSolversAgreeInPeriodAndWavelength) {
    for (const bool deep : {false, true}) {
        SCOPED_TRACE(deep ? "B 1/15" : "B 0");
        const int32_t formulation = deep ? 2 : 1;
        const double beta = deep ? kOneFifteenth : 0.0;
        const double theory = 2.0 * kPi / bwtest::TheoryOmega(1.0, 1.0, beta);
        // The standing wave at 24 elements and 30 points a wavelength; the
        // 2DH scheme wants a Courant number below 1 with the deep-water terms.
        const double t1 = StandingPeriod1DH(formulation, beta, 1.0, 24, 100);
        const double t2 = StandingPeriod2DH(deep, 30, 60);
        std::printf("standing wave kd 1, B = %.4f: period 1DH %+.2e, 2DH %+.2e, 1DH/2DH %+.2e\n",
                    beta, t1 / theory - 1.0, t2 / theory - 1.0, t1 / t2 - 1.0);
        EXPECT_NEAR(t1 / t2, 1.0, 0.01);
        EXPECT_NEAR(t1 / theory, 1.0, 0.01);
        EXPECT_NEAR(t2 / theory, 1.0, 0.01);

        // A wave of the same period sent in by a flux boundary in each: the
        // wavelength along the line at the end of the run.
        bwtest::TempDir dir;
        const DrivenWave one = RunDrivenWave(4, formulation, beta, 1.0, 24, 100, dir);
        ASSERT_EQ(one.status, 0);
        const double T = theory, a = 1.0e-3;
        const bwtest::Channel ch = bwtest::MakeChannel(1, deep, T, a, 10, 9);
        bwtest::RunSteps(ch.steps);
        // Water points j = 15..90 (0.5 to 3 wavelengths) of the middle row,
        // after the ramp of four periods and five more.
        std::vector<double> row;
        for (int32_t j = 15; j <= 90; ++j) row.push_back(gGrid.xi[gGrid.At(j, 2)]);
        const double two = WavelengthOf(bwtest::ZeroCrossings(row, ch.dx));
        const double lambda = 2.0 * kPi / one.theoryK;
        std::printf("driven wave kd 1, B = %.4f: wavelength 1DH %+.2e, 2DH %+.2e, 1DH/2DH %+.2e\n",
                    beta, one.wavelength / lambda - 1.0, two / lambda - 1.0,
                    one.wavelength / two - 1.0);
        EXPECT_NEAR(one.wavelength / two, 1.0, 0.01);
        EXPECT_NEAR(two / lambda, 1.0, 0.01);
    }
}

TEST(UserResolution, TwentyElementsAWavelengthAndFortyStepsAPeriodStayWithinOnePercent) {
    // The resolution a user would pick: the standing-wave period and the
    // driven wave's celerity, wavelength and amplitude.
    bwtest::TempDir dir;
    struct Case {
        int32_t formulation;
        double beta, kd;
    };
    for (const Case c :
         {Case{1, 0.0, 1.0}, Case{2, kOneFifteenth, 1.0}, Case{2, kOneFifteenth, 2.0}}) {
        SCOPED_TRACE(testing::Message() << "B " << c.beta << " kd " << c.kd);
        const double T = 2.0 * kPi / bwtest::TheoryOmega(c.kd, 1.0, c.beta);
        const double period = StandingPeriod1DH(c.formulation, c.beta, c.kd, 20, 40);
        const DrivenWave w = RunDrivenWave(4, c.formulation, c.beta, c.kd, 20, 40, dir);
        ASSERT_EQ(w.status, 0);
        const double lambda = 2.0 * kPi / w.theoryK;
        std::printf(
            "20 elements, 40 steps, B = %.4f, kd = %.1f: standing period %+.2e, "
            "celerity %+.2e, wavelength %+.2e, amplitude %+.2e\n",
            c.beta, c.kd, period / T - 1.0, w.celerity / w.theoryC - 1.0,
            w.wavelength / lambda - 1.0, w.amplitude / 1.0e-3 - 1.0);
        EXPECT_NEAR(period / T, 1.0, 0.01);
        EXPECT_NEAR(w.celerity / w.theoryC, 1.0, 0.01);
        EXPECT_NEAR(w.wavelength / lambda, 1.0, 0.01);
        EXPECT_NEAR(w.amplitude / 1.0e-3, 1.0, 0.05);
    }
}

}  // namespace
