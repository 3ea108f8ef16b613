// The physics of the 1DH mesh solver in small runs against the linear
// theory of the equations, for classical and enhanced dispersion: the period
// of a standing wave in a closed flume with the volume it keeps, the observed
// orders in time and space; waves sent in at the left end of a long flume
// through the boundary codes a model file gives (a level boundary and a flux
// boundary both become flux boundaries of the mesh solver) travel at the
// celerity and with the wavelength of the dispersion relation; and the same
// flume run by the 1DH and the 2DH solver gives the same period and wavelength.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <numbers>
#include <string>
#include <vector>

#include "equations_flume.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/model_builder.hpp"

namespace {

using bwtest::RunStandingWave;
using bwtest::StandingWave;

constexpr double kPi = std::numbers::pi;
constexpr double kOneFifteenth = 1.0 / 15.0;

struct Equations {
    int32_t formulation;
    double beta;
};
constexpr Equations kClassical{1, 0.0}, kEnhanced{2, kOneFifteenth};

TEST(Flume, StandingWavePeriodFollowsTheLinearDispersionAndKeepsTheVolume) {
    for (const Equations e : {kClassical, kEnhanced}) {
        for (const double kd : {0.3, 1.0, 2.0, 3.0}) {
            SCOPED_TRACE(testing::Message() << "B " << e.beta << " kd " << kd);
            const StandingWave w = RunStandingWave(kd, e.formulation, e.beta, 24, 100, 3, 1.0e-4);
            ASSERT_EQ(w.status, 0);
            EXPECT_NEAR(w.period / w.theory, 1.0, 3.0e-3);
            EXPECT_LT(w.volumeDrift, 1.0e-6 * w.waterVolume);
        }
    }
}

double MaxDifference(const std::vector<double>& a, const std::vector<double>& b) {
    double e = 0.0;
    for (size_t i = 1; i < a.size(); ++i) e = std::max(e, std::abs(a[i] - b[i]));
    return e;
}

TEST(Flume, ThirdOrderInTimeAndSecondInSpace) {
    for (const Equations e : {kClassical, kEnhanced}) {
        SCOPED_TRACE(testing::Message() << "B " << e.beta);
        // The surface after one period (kd = 1, 16 elements) with 10, 20
        // and 40 steps a period, against 640 steps.
        const auto surface = [&](int32_t steps) {
            const StandingWave w = RunStandingWave(1.0, e.formulation, e.beta, 16, steps, 1, 1e-3);
            EXPECT_EQ(w.status, 0);
            return w.surface;
        };
        const std::vector<double> reference = surface(640);
        double error[3];
        for (int r = 0; r < 3; ++r) error[r] = MaxDifference(surface(10 << r), reference);
        const double inTime = std::log2(error[1] / error[2]);
        EXPECT_GT(inTime, 2.7) << error[0] << " " << error[1] << " " << error[2];
        EXPECT_LT(inTime, 3.5) << error[0] << " " << error[1] << " " << error[2];

        // The period (kd = 1 and 2) with 4, 8 and 16 elements a wavelength;
        // 400 steps a period leave the time error far below.
        for (const double kd : {1.0, 2.0}) {
            for (int r = 0; r < 3; ++r) {
                const StandingWave w =
                    RunStandingWave(kd, e.formulation, e.beta, 4 << r, 400, 2, 1.0e-6);
                ASSERT_EQ(w.status, 0);
                error[r] = std::abs(w.period - w.theory) / w.theory;
            }
            EXPECT_GT(std::log2(error[1] / error[2]), 1.8)
                << "kd " << kd << ": " << error[0] << " " << error[1] << " " << error[2];
        }
    }
}

// The wavelength from the crossings of a profile: twice the mean distance
// between successive crossings (both directions), 0 with fewer than three.
double WavelengthOf(const std::vector<double>& crossings) {
    if (crossings.size() < 3) return 0.0;
    return 2.0 * (crossings.back() - crossings.front()) / static_cast<double>(crossings.size() - 1);
}

struct DrivenWave {
    double theoryK = 0.0, theoryC = 0.0;
    double celerity = 0.0;    // from the phase shift between two gauges
    double wavelength = 0.0;  // from the surface along the line at the last step
    double amplitude = 0.0;   // at the first gauge
    int32_t status = 0;
    std::vector<double> surface;  // at the end
};

// A flat flume in 1 m of water, 12 wavelengths long at `perWavelength`
// elements a wavelength and `perPeriod` steps a period T. Its left end
// carries code 2 and its right end code 3, the codes the model reader gives
// a line with a boundary at its first point, both of the code type of that
// boundary (3 from a level boundary, 4 from a flux boundary). Code 2 reads a
// series with the flux a c sin(omega t) as item 1 and the surface slope
// -k a cos(omega t) as item 2 (the enhanced equations need it for the
// auxiliary variable), soft started over two periods; code 3 has no data: a
// wall. Gauges one and two wavelengths in, fitted over 6 T to 9 T; the
// wavelength along 0.5 to 2.5 wavelengths at 9 T. The fastest disturbance,
// sqrt(g d), is 10 wavelengths in by then and the wall's reflection far off.
DrivenWave RunDrivenWave(int32_t codeType, Equations e, double kd, int32_t perWavelength,
                         int32_t perPeriod, const bwtest::TempDir& dir) {
    const double k = kd, a = 1.0e-3;
    const double omega = bwtest::TheoryOmega(k, 1.0, e.beta), T = 2.0 * kPi / omega;
    const double lambda = 2.0 * kPi / k, dt = T / perPeriod;
    const int32_t steps = 9 * perPeriod;
    DrivenWave w;
    w.theoryK = k;
    w.theoryC = omega / k;

    BwModel& m = bwtest::BuildFlume(
        12 * perWavelength, 12 * lambda, [](double) { return 1.0; }, e.formulation, e.beta, dt);
    const Mesh& line = gMeshes.meshes[1];
    bwtest::SetNodeCode(line.NodeCount, 3);
    std::vector<float> series(steps + 2), slope(steps + 2);
    for (size_t n = 0; n < series.size(); ++n) {
        series[n] = static_cast<float>(a * w.theoryC * std::sin(omega * n * dt));
        slope[n] = static_cast<float>(-k * a * std::cos(omega * n * dt));
    }
    const std::string seriesFile = dir / "q.xol0", type = std::to_string(codeType);
    bwtest::WriteSeriesFile(seriesFile, "2004-01-01 00:00:00", dt, {series, slope});
    char soft[64];
    std::snprintf(soft, sizeof soft, "soft_time_interval = %.17g\n", 2.0 * T);
    bwtest::ReadBoundaryConditions(m, dir / "s.kvt",
                                   "CODE_2 {\ntype = " + type + "\nformat = 1\n" + soft +
                                       "file_name = \"" + seriesFile +
                                       "\"\nitem_numbers = 1, 2\n}\nCODE_3 {\ntype = " + type +
                                       "\nformat = 0\n" + soft + "}\n",
                                   dt, steps);
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
    const bwtest::Harmonic p1 = bwtest::FitHarmonic(h1, (from + 1) * dt, dt, omega);
    const bwtest::Harmonic p2 = bwtest::FitHarmonic(h2, (from + 1) * dt, dt, omega);
    const double distance = line.x[gauge2] - line.x[gauge1];
    double shift = p2.phase - p1.phase;
    shift += 2.0 * kPi * std::round((k * distance - shift) / (2.0 * kPi));
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

void ExpectTheRelation(const DrivenWave& w) {
    EXPECT_NEAR(w.celerity / w.theoryC, 1.0, 0.01);
    EXPECT_NEAR(w.wavelength * w.theoryK / (2.0 * kPi), 1.0, 0.01);
    EXPECT_NEAR(w.amplitude / 1.0e-3, 1.0, 0.05);
}

struct WaveCase {
    Equations e;
    double kd;
};
constexpr WaveCase kWaves[] = {{kClassical, 1.0}, {kEnhanced, 1.0}, {kEnhanced, 2.0}};

TEST(DrivenWave, LevelAndFluxBoundariesSendWavesAtTheCelerityOfTheRelation) {
    bwtest::TempDir dir;
    for (const WaveCase c : kWaves) {
        std::vector<double> surfaceOfType[2];
        for (const int32_t codeType : {3, 4}) {
            SCOPED_TRACE(testing::Message()
                         << "code type " << codeType << " B " << c.e.beta << " kd " << c.kd);
            const DrivenWave w = RunDrivenWave(codeType, c.e, c.kd, 24, 100, dir);
            ASSERT_EQ(w.status, 0);
            ExpectTheRelation(w);
            surfaceOfType[codeType - 3] = w.surface;
        }
        // A level boundary of the model file is a flux boundary here: the
        // same series gives the same run.
        EXPECT_EQ(surfaceOfType[0], surfaceOfType[1]);
    }
}

TEST(UserResolution, TwentyElementsAWavelengthAndFortyStepsAPeriodStayWithinOnePercent) {
    bwtest::TempDir dir;
    for (const WaveCase c : kWaves) {
        SCOPED_TRACE(testing::Message() << "B " << c.e.beta << " kd " << c.kd);
        const StandingWave s = RunStandingWave(c.kd, c.e.formulation, c.e.beta, 20, 40, 3, 1e-3);
        EXPECT_NEAR(s.period / s.theory, 1.0, 0.01);
        const DrivenWave w = RunDrivenWave(4, c.e, c.kd, 20, 40, dir);
        ASSERT_EQ(w.status, 0);
        ExpectTheRelation(w);
    }
}

// The period of the standing wave (kd = 1) in a 2DH basin three water
// points wide with land on all sides: `cells` water points along the flume,
// the walls at the faces beside the land, from the first water point of the
// middle row.
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
        const Equations e = deep ? kEnhanced : kClassical;
        // The standing wave at 24 elements and 30 points a wavelength; the
        // 2DH scheme wants a Courant number below 1 with the deep-water terms.
        const StandingWave one = RunStandingWave(1.0, e.formulation, e.beta, 24, 100, 3, 1e-3);
        const double two = StandingPeriod2DH(deep, 30, 60);
        EXPECT_NEAR(one.period / two, 1.0, 0.01);
        EXPECT_NEAR(two / one.theory, 1.0, 0.01);

        // A wave of the same period sent in by a flux boundary in each: the
        // wavelength along the line at the end of the run.
        bwtest::TempDir dir;
        const DrivenWave driven = RunDrivenWave(4, e, 1.0, 24, 100, dir);
        ASSERT_EQ(driven.status, 0);
        const bwtest::Channel ch = bwtest::MakeChannel(1, deep, one.theory, 1.0e-3, 10, 9);
        bwtest::RunSteps(ch.steps);
        // Water points j = 15..90 (0.5 to 3 wavelengths) of the middle row,
        // after the ramp of four periods and five more.
        std::vector<double> row;
        for (int32_t j = 15; j <= 90; ++j) row.push_back(gGrid.xi[gGrid.At(j, 2)]);
        const double wavelength2 = WavelengthOf(bwtest::ZeroCrossings(row, ch.dx));
        EXPECT_NEAR(driven.wavelength / wavelength2, 1.0, 0.01);
        EXPECT_NEAR(wavelength2 * driven.theoryK / (2.0 * kPi), 1.0, 0.01);
    }
}

}  // namespace
