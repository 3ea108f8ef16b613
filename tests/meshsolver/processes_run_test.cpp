// The processes of a 1DH run against theory, each from a model file: waves
// made on a generation node inside the flume, absorbed by sponge layers at
// both ends; linear shoaling on a mild slope; rollers on a beach; the runup
// of a solitary wave.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <vector>

#include "meshsolver/profile_run.hpp"

namespace {

using bwtest::kTwoPi;

constexpr double kB = 1.0 / 15.0;

std::string DeepTerms() {
    return "Deep_Water_Terms = true\nDispersion_Factor = 0.0666666667\n";
}

// Sponges of `left` and `right` m at the ends of a line of n + 1 points dx
// apart, rising quadratically from 1 to 1.5 at the walls.
std::vector<float> SpongeMap(int n, double dx, double left, double right) {
    std::vector<float> s(n + 1, 1.0f);
    for (int j = 0; j <= n; ++j)
        for (auto [in, width] : {std::pair{j * dx, left}, std::pair{(n - j) * dx, right}})
            if (in < width) s[j] = static_cast<float>(1.0 + 0.5 * std::pow(1.0 - in / width, 2));
    return s;
}

// The amplitude of the surface at each node over the last periods of a run,
// and the reflection coefficient (Hmax - Hmin) / (Hmax + Hmin) of the
// envelope over a stretch of nodes.
struct Envelope {
    std::vector<double> amplitude;  // 1-based nodes
    double Reflection(int32_t from, int32_t to) const {
        double hi = 0.0, lo = 1e30;
        for (int32_t i = from; i <= to; ++i) {
            hi = std::max(hi, amplitude[i]);
            lo = std::min(lo, amplitude[i]);
        }
        return (hi - lo) / (hi + lo);
    }
    double Mean(int32_t from, int32_t to) const {
        double m = 0.0;
        for (int32_t i = from; i <= to; ++i) m += amplitude[i];
        return m / (to - from + 1);
    }
};

// Runs steps 1..steps, fitting the surface of every node over the last
// `periods` periods of T.
Envelope RunAndFit(int32_t steps, double dt, double T, int32_t periods) {
    const int32_t n = static_cast<int32_t>(gBwModel.Elevation.size()) - 1;
    const int32_t from = steps - static_cast<int32_t>(std::lround(periods * T / dt)) + 1;
    std::vector<std::vector<double>> series(n + 1);
    const bool ok = bwtest::StepProfileRun(1, steps, dt, [&](int32_t s) {
        if (s < from) return;
        for (int32_t i = 1; i <= n; ++i) series[i].push_back(gBwModel.Elevation[i]);
    });
    EXPECT_TRUE(ok) << "the run blew up";
    Envelope e;
    e.amplitude.assign(n + 1, 0.0);
    for (int32_t i = 1; i <= n && ok; ++i)
        e.amplitude[i] = bwtest::FitHarmonic(series[i], 0.0, dt, kTwoPi / T).amplitude;
    return e;
}

// The amplitude a source of flux amplitude Q makes on each side, by linear
// theory of the equations: a = Q / (cg (1 + (B + 1/3)(kd)^2)), which is Q / c
// without the deep-water terms.
double SourceAmplitude(double Q, double T, double d, double B) {
    const double kd = bwtest::WaveNumberOf(T, d, B) * d;
    return Q / (bwtest::GroupVelocity(T, d, B) * (1.0 + (B + 1.0 / 3.0) * kd * kd));
}

// A generation node in the middle of a flume of 1 m water sends a wave of
// the amplitude of linear theory both ways; the sponge layers at the walls
// take them out, so that the envelope in front of each is flat.
TEST(GenerationAndSponge, WavesLeaveTheSourceBothWaysAtTheAmplitudeOfTheoryAndAreAbsorbed) {
    struct Case {
        double B, T;
        bool deep;
    };
    for (const Case& w : {Case{kB, 2.0, true}, Case{0.0, 4.0, false}}) {
        SCOPED_TRACE(w.T);
        const double d = 1.0, a = 0.005;
        const double k = bwtest::WaveNumberOf(w.T, d, w.B), L = kTwoPi / k, c = L / w.T;
        const int perWavelength = 25, perPeriod = 40;
        const double dx = L / perWavelength, dt = w.T / perPeriod;
        const int n = 14 * perWavelength, source = n / 2;  // 2 L of sponge, 5 L free a side
        const double sponge = 2.0 * L, Q = a * c;

        bwtest::TempDir dir;
        bwtest::WriteProfile(dir / "bed.xol1", dx,
                             std::vector<float>(n + 1, -static_cast<float>(d)));
        bwtest::WriteProfile(dir / "sponge.xol1", dx, SpongeMap(n, dx, sponge, sponge), "Sponge");
        const int32_t steps = 26 * perPeriod;
        bwtest::WriteSeriesFile(
            dir / "gen.xol0", "2004-01-01 00:00:00", dt,
            {bwtest::RampedSine(Q, w.T, dt, steps + 2, 3.0), std::vector<float>(steps + 2, 0.0f)});
        bwtest::SetUpProfileRun(
            dir, dt,
            {{"Equation_Parameters",
              w.deep ? DeepTerms() : "Deep_Water_Terms = false\nDispersion_Factor = 0\n"},
             {"Internal_Generation",
              "Number_Of_Records = 1\n" +
                  bwtest::GenerationRecord(1, source, 0, source, 0, 0, "gen.xol0")},
             {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol1")}});
        if (HasFatalFailure()) return;

        const Envelope e = RunAndFit(steps, dt, w.T, 4);
        const double theory = SourceAmplitude(Q, w.T, d, w.B);
        // Nodes are 1-based: grid index j is node j + 1. A wavelength clear
        // of the source and of the sponge on either side.
        const int32_t spongeNodes = static_cast<int32_t>(sponge / dx);
        const int32_t leftFrom = spongeNodes + 2, leftTo = source + 1 - perWavelength;
        const int32_t rightFrom = source + 1 + perWavelength, rightTo = n - spongeNodes;
        for (auto [from, to] : {std::pair{leftFrom, leftTo}, std::pair{rightFrom, rightTo}}) {
            const double kr = e.Reflection(from, to);
            std::printf(
                "T %.1f, nodes %d..%d: amplitude %+.2f %% off theory, reflected energy "
                "%.3f %%\n",
                w.T, from, to, 100.0 * (e.Mean(from, to) / theory - 1.0), 100.0 * kr * kr);
            EXPECT_NEAR(e.Mean(from, to) / theory, 1.0, 0.03) << from;
            EXPECT_LT(kr * kr, 0.05) << from;
        }
    }
}

// Waves from a source in 0.5 m of water climb a slope of 1:50 onto a shelf of
// 0.2 m, with sponges behind the source and at the end of the shelf. The
// height follows the conservation of the energy flux a^2 cg with cg of the
// equations' relation, over the slope and on the shelf.
TEST(Shoaling, HeightOnAMildSlopeKeepsTheEnergyFluxOfTheRelation) {
    const double T = 1.5, a = 0.002, d0 = 0.5, d1 = 0.2, slope = 1.0 / 50.0;
    const double L0 = kTwoPi / bwtest::WaveNumberOf(T, d0, kB);
    const double L1 = kTwoPi / bwtest::WaveNumberOf(T, d1, kB);
    const double dx = L1 / 25.0, dt = T / 40.0;
    const double sponge = 2.0 * L0, toe = sponge + 2.5 * L0, top = toe + (d0 - d1) / slope;
    const double end = top + 3.0 * L1 + sponge;
    const int n = static_cast<int>(std::ceil(end / dx)), source = static_cast<int>(sponge / dx) + 5;
    std::vector<float> bed(n + 1), sponges(n + 1, 1.0f);
    for (int j = 0; j <= n; ++j) {
        const double x = j * dx;
        bed[j] = -static_cast<float>(std::clamp(d0 - (x - toe) * slope, d1, d0));
        const double in = std::min(x, end - x);
        if (in < sponge)
            sponges[j] = static_cast<float>(1.0 + 0.5 * std::pow(1.0 - in / sponge, 2));
    }
    bwtest::TempDir dir;
    bwtest::WriteProfile(dir / "bed.xol1", dx, bed);
    bwtest::WriteProfile(dir / "sponge.xol1", dx, sponges, "Sponge");
    const int32_t steps = 40 * 40;
    const double Q = a * L0 / T;
    bwtest::WriteSeriesFile(
        dir / "gen.xol0", "2004-01-01 00:00:00", dt,
        {bwtest::RampedSine(Q, T, dt, steps + 2, 3.0), std::vector<float>(steps + 2, 0.0f)});
    bwtest::SetUpProfileRun(
        dir, dt,
        {{"Equation_Parameters", DeepTerms()},
         {"Internal_Generation",
          "Number_Of_Records = 1\n" +
              bwtest::GenerationRecord(1, source, 0, source, 0, 0, "gen.xol0")},
         {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol1")}});
    if (HasFatalFailure()) return;
    const Envelope e = RunAndFit(steps, dt, T, 4);

    // The incoming amplitude in front of the toe, then a wavelength's mean
    // around each place against a0 sqrt(cg0 / cg).
    const auto node = [&](double x) { return static_cast<int32_t>(std::lround(x / dx)) + 1; };
    const auto around = [&](double x, double L) {
        return e.Mean(node(x - L / 2.0), node(x + L / 2.0));
    };
    const double a0 = around(toe - L0, L0), cg0 = bwtest::GroupVelocity(T, d0, kB);
    for (double x : {toe + 0.5 * (top - toe), top + 1.5 * L1}) {
        const double depth = std::clamp(d0 - (x - toe) * slope, d1, d0);
        const double L = kTwoPi / bwtest::WaveNumberOf(T, depth, kB);
        const double theory = a0 * std::sqrt(cg0 / bwtest::GroupVelocity(T, depth, kB));
        std::printf("depth %.3f m: amplitude %.5f, theory %.5f (%+.2f %%), a0 %.5f\n", depth,
                    around(x, L), theory, 100.0 * (around(x, L) / theory - 1.0), a0);
        EXPECT_NEAR(around(x, L) / theory, 1.0, 0.03) << depth;
    }
}

}  // namespace

namespace {

// A copy of a laboratory flume (Hansen and Svendsen, 1979, the waves of
// 1.67 s) in one dimension: 0.36 m of water, a slope of 1:34.3 from the toe
// up to a wall in 3 cm of water with a sponge over its last 0.5 m; waves of
// 6.8 cm from a generation node on the flat bed, a sponge behind it, the
// explicit filter (0.1) from 5 m past the toe on, where the rollers stand.
// dx 0.05 m, T/64 a step, the wave height (mean crest to trough of each
// period) and the mean level over the last 4 of 20 periods.
struct Beach1D {
    std::vector<double> x, height, mean;  // x from the toe, by grid index
    double deltaMax = 0.0;
    bool blewUp = false;
};

Beach1D RunBeach1D(bool rollers) {
    constexpr double kDepth = 0.36, kSlope = 1.0 / 34.3, kT = 1.67, kH = 0.068, kDx = 0.05;
    constexpr double kEnd = 0.03, kSponge = 0.5;
    constexpr int32_t kPerPeriod = 64, kPeriods = 20, kKept = 4;
    const double k = bwtest::WaveNumberOf(kT, kDepth, 0.0), L = kTwoPi / k;
    const double back = 1.5 * L, flat = back + 1.5 * L;  // sponge behind, then flat bed to the toe
    const int n = static_cast<int>(std::lround((flat + (kDepth - kEnd) / kSlope) / kDx));
    const int source = static_cast<int>(std::lround((back + 0.3) / kDx));
    std::vector<float> bed(n + 1), filter(n + 1, 0.0f);
    Beach1D out;
    for (int j = 0; j <= n; ++j) {
        const double x = j * kDx;
        out.x.push_back(x - flat);
        bed[j] = static_cast<float>(-kDepth + std::max(x - flat, 0.0) * kSlope);
        if (x - flat > 5.0) filter[j] = 0.1f;
    }
    bwtest::TempDir dir;
    bwtest::WriteProfile(dir / "bed.xol1", kDx, bed);
    bwtest::WriteProfile(dir / "sponge.xol1", kDx, SpongeMap(n, kDx, back, kSponge), "Sponge");
    bwtest::WriteProfile(dir / "filter.xol1", kDx, filter, "Filter");
    const double dt = kT / kPerPeriod;
    const int32_t steps = kPeriods * kPerPeriod, kept = kKept * kPerPeriod;
    bwtest::WriteSeriesFile(dir / "gen.xol0", "2004-01-01 00:00:00", dt,
                            {bwtest::RampedSine(0.5 * kH * L / kT, kT, dt, steps + 2, 3.0),
                             std::vector<float>(steps + 2, 0.0f)});
    bwtest::SetUpProfileRun(
        dir, dt,
        {{"Internal_Generation",
          "Number_Of_Records = 1\n" +
              bwtest::GenerationRecord(1, source, 0, source, 0, 0, "gen.xol0")},
         {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol1")},
         {"EXPLICIT_FILTERING", "type = 2\n" + bwtest::DataFileSection("filter.xol1")},
         {"WAVE_BREAKING", rollers ? "type = 1\n" : "type = 0\n"}});
    if (testing::Test::HasFatalFailure()) return out;
    std::vector<double> hi(n + 2, -1.0), lo(n + 2, 1.0), sum(n + 2, 0.0);
    out.mean.assign(n + 1, 0.0);
    out.blewUp = !bwtest::StepProfileRun(1, steps, dt, [&](int32_t s) {
        for (size_t i = 1; rollers && i < gBwModel.Breaking.delta.size(); ++i) {
            const double delta = gBwModel.Breaking.delta[i];
            out.deltaMax = std::max(out.deltaMax, delta);
            EXPECT_LE(delta, std::max(gBwModel.TotalDepth[i], 0.0))
                << "step " << s << " node " << i;
        }
        if (s <= steps - kept) return;
        for (int j = 0; j <= n; ++j) {
            const double v = gBwModel.Elevation[j + 1];
            hi[j] = std::max(hi[j], v), lo[j] = std::min(lo[j], v);
            out.mean[j] += v / kept;
        }
        if ((steps - s) % kPerPeriod == 0)
            for (int j = 0; j <= n; ++j) {
                sum[j] += hi[j] - lo[j];
                hi[j] = -1.0, lo[j] = 1.0;
            }
    });
    for (int j = 0; j <= n; ++j) out.height.push_back(sum[j] / kKept);
    return out;
}

TEST(Rollers1D, OnABeachTheHeightPeaksAndFallsThroughTheSurfZoneTheMeanLevelFallsThenRises) {
    const Beach1D b = RunBeach1D(true);
    ASSERT_FALSE(b.blewUp);
    const auto index = [&](double x) {
        return static_cast<size_t>(std::lround((x - b.x.front()) / (b.x[1] - b.x[0])));
    };
    const size_t toe = index(0.0), end = index(b.x.back() - 0.7);
    const size_t peak =
        std::max_element(b.height.begin() + toe, b.height.begin() + end) - b.height.begin();
    const double xb = b.x[peak], hb = b.height[peak], h0 = b.height[toe];
    SCOPED_TRACE(testing::Message() << "breaking at x " << xb << " m, height " << hb
                                    << " m, at the toe " << h0 << " m");
    // Measured: 0.069 m at the toe, the highest 0.104 m at 8.2 m, a third of
    // that at 10.5 m; the model breaks more gently (docs/validation.md).
    EXPECT_NEAR(h0, 0.068, 0.005);
    EXPECT_GT(hb, 1.15 * h0);
    EXPECT_GT(xb, 7.0);
    EXPECT_LT(xb, 9.0);
    EXPECT_LT(b.height[end], 0.8 * hb);
    // Set-down in front of the break, set-up behind it, from the toe's level.
    const double atBreak = *std::min_element(b.mean.begin() + toe, b.mean.begin() + peak + 1);
    EXPECT_LT(atBreak, b.mean[toe] - 3e-4);
    EXPECT_GT(b.mean[end], b.mean[toe] + 2e-3);
    EXPECT_GT(b.deltaMax, 0.01);
    // Without rollers nothing takes the energy out: the waves grow until
    // the run stops, or stand far higher near the wall.
    const Beach1D plain = RunBeach1D(false);
    EXPECT_TRUE(plain.blewUp || plain.height[end] > 1.3 * b.height[end]);
}

}  // namespace

namespace {

// The runup of a solitary wave on a plane beach, from the runup output of a
// 1DH run with the moving shoreline, against the runup law of Synolakis
// (1987) for waves that do not break: R / d = 2.831 sqrt(cot beta) (H / d)^(5/4).
// A flume of 1 m water: a generation node 40 m from the left wall with a
// sponge behind it, the toe of a 1:19.85 slope 30 m further on, the beach
// up to 0.15 m above the still water, then a wall. The node sends a
// solitary wave of height H each way (the flux c eta of the wave, c =
// sqrt(g (d + H))); the one to the right runs up the beach. A gauge 10 m
// before the toe measures the height that arrives (the incoming height),
// the highest "Vertical runup" is the runup.
std::pair<double, double> RunSolitaryWave(double H, double dx, double dt) {
    const double d = 1.0, cotBeta = 19.85, g = 9.81;
    const double source = 40.0, toe = 70.0, top = 0.15;
    const int n = static_cast<int>(std::lround((toe + (d + top) * cotBeta) / dx));
    std::vector<float> bed(n + 1);
    for (int j = 0; j <= n; ++j)
        bed[j] = static_cast<float>(-d + std::max(j * dx - toe, 0.0) / cotBeta);
    bwtest::TempDir dir;
    bwtest::WriteProfile(dir / "bed.xol1", dx, bed);
    bwtest::WriteProfile(dir / "sponge.xol1", dx, SpongeMap(n, dx, 30.0, 0.0), "Sponge");
    const int steps = static_cast<int>(std::lround(45.0 / dt));
    const double c = std::sqrt(g * (d + H)), K = std::sqrt(3.0 * H / (4.0 * d * d * d));
    const double t0 = 5.0 / (K * c);
    std::vector<float> flux(steps + 2), zero(steps + 2, 0.0f);
    for (int s = 0; s < steps + 2; ++s) {
        const double sech = 1.0 / std::cosh(K * c * (s * dt - t0));
        flux[s] = static_cast<float>(c * H * sech * sech);
    }
    bwtest::WriteSeriesFile(dir / "gen.xol0", "2004-01-01 00:00:00", dt, {flux, zero});
    const std::string at = std::to_string(std::lround(source / dx));
    const std::string gauge = std::to_string(std::lround((toe - 10.0) / dx));
    const bwtest::RunResult r = bwtest::RunProfileModel(
        dir,
        {{"Simulation_Period", bwtest::Period(steps, dt)},
         {"MOVING_SHORELINE",
          "type = 1\ndepth = -0.2\nwidth = 0.01\nsmoothing_parameter = 100\n"
          "friction_coefficient = 0.1\n"},
         {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol1")},
         {"Internal_Generation",
          "Number_Of_Records = 1\n" +
              bwtest::GenerationRecord(1, std::stoi(at), 0, std::stoi(at), 0, 0, "gen.xol0")},
         {"OUTPUT_DETERMINISTIC_1D",
          bwtest::One(bwtest::Places("gauge.xol0", gauge, 1) + bwtest::Span(0, steps, 1, "3"))},
         {"OUTPUT_MOVING_SHORELINE_1D",
          "INCLUDE_CALCULATION = true\n" +
              bwtest::Record(
                  1, "File_Name = file(\"runup.xol0\")\n" + bwtest::Span(0, steps, 1, "1, 2, 3"))}},
        false, "bed.xol1");
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    double incoming = 0.0, runup = 0.0;
    for (const auto& record : bwtest::ReadDataFile(dir / "gauge.xol0").records)
        incoming = std::max(incoming, static_cast<double>(record[0][0]));
    for (const auto& record : bwtest::ReadDataFile(dir / "runup.xol0").records)
        runup = std::max(runup, static_cast<double>(record[1][0]));
    return {incoming, runup};
}

// A non-breaking wave on 1:19.85 (H / d below 0.818 (cot beta)^(-10/9) =
// 0.031), at a grid and step a user would choose: 20 points over the
// wave's half-width 1 / K, a Courant number of 0.3. The slot lies 0.2 m
// under the still water: the slot adds L (w + 1/s) of depth to every node
// within L of its bottom, and a slot 1 m deep took 10 to 30 % off the
// runup. Its friction of 0.1 keeps the slot water under the dry beach from
// draining below the slot's bottom after the wave has gone back.
TEST(Runup, ASolitaryWaveClimbsAPlaneBeachAsTheRunupLawSays) {
    const double H = 0.01;
    const auto [incoming, runup] = RunSolitaryWave(H, 0.05, 0.005);
    const double law = 2.831 * std::sqrt(19.85) * std::pow(incoming, 1.25);
    std::printf("H/d target %.4f, arrived %.4f: runup %.4f m, law %.4f m (%+.1f %%)\n", H, incoming,
                runup, law, 100.0 * (runup / law - 1.0));
    EXPECT_NEAR(runup / law, 1.0, 0.10);
}

}  // namespace
