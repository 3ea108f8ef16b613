// The runup of a solitary wave on a plane beach, from the runup output of a
// 1DH run with the moving shoreline, against the runup law of Synolakis
// (1987) for waves that do not break: R / d = 2.831 sqrt(cot beta) (H / d)^(5/4).
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <vector>

#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

// A flume of 1 m water: a generation node 40 m from the left wall with a
// sponge behind it, the toe of a 1:19.85 slope 30 m further on, the beach
// up to 0.15 m above the still water, then a wall. The node sends a
// solitary wave of height H each way (the flux c eta of the wave, c =
// sqrt(g (d + H))); the one to the right runs up the beach. A gauge 10 m
// before the toe measures the height that arrives.
struct Runup {
    double incoming = 0.0;  // the highest surface at the gauge
    double runup = 0.0;     // the highest "Vertical runup"
    int exitCode = -1;
};

Runup RunSolitaryWave(double H, double dx, double dt) {
    const double d = 1.0, cotBeta = 19.85, g = 9.81;
    const double source = 40.0, toe = 70.0, top = 0.15;
    const int n = static_cast<int>(std::lround((toe + (d + top) * cotBeta) / dx));
    std::vector<float> bed(n + 1), sponge(n + 1, 1.0f);
    for (int j = 0; j <= n; ++j) {
        const double x = j * dx;
        bed[j] = static_cast<float>(-d + std::max(x - toe, 0.0) / cotBeta);
        if (x < 30.0) sponge[j] = static_cast<float>(1.0 + 0.5 * std::pow(1.0 - x / 30.0, 2));
    }
    bwtest::TempDir dir;
    bwtest::WriteLineFile(dir / "bed.xol1", "2004-01-01 00:00:00", 1.0, static_cast<float>(dx),
                          {{bed}}, 0, {"Bathymetry"});
    bwtest::WriteLineFile(dir / "sponge.xol1", "2004-01-01 00:00:00", 1.0, static_cast<float>(dx),
                          {{sponge}}, 0, {"Sponge"});
    const int steps = static_cast<int>(std::lround(45.0 / dt));
    const double c = std::sqrt(g * (d + H)), K = std::sqrt(3.0 * H / (4.0 * d * d * d));
    const double t0 = 5.0 / (K * c);
    std::vector<float> flux(steps + 2), zero(steps + 2, 0.0f);
    for (int s = 0; s < steps + 2; ++s) {
        const double sech = 1.0 / std::cosh(K * c * (s * dt - t0));
        flux[s] = static_cast<float>(c * H * sech * sech);
    }
    bwtest::WriteSeriesFile(dir / "gen.xol0", "2004-01-01 00:00:00", dt, {flux, zero});
    const int sourceIndex = static_cast<int>(std::lround(source / dx));
    const int gauge = static_cast<int>(std::lround((toe - 10.0) / dx));
    const std::string span = "First_Time_step = 0\nLast_Time_step = " + std::to_string(steps) +
                             "\nTime_Step_Interval = 1\n";
    std::map<std::string, std::string> s = bwtest::ProfileSections(
        {{"Simulation_Period", "Time_step_count = " + std::to_string(steps) +
                                   "\nTime_step_interval = " + std::to_string(dt) +
                                   "\nWarm_up_period = 0\nStart_time = 2004, 1, 1, 0, 0, 0\n"},
         {"MOVING_SHORELINE",
          "type = 1\ndepth = -0.2\nwidth = 0.01\nsmoothing_parameter = 100\n"
          "friction_coefficient = 0.1\n"},
         {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol1")},
         {"Internal_Generation",
          "Number_Of_Records = 1\n" +
              bwtest::GenerationRecord(1, sourceIndex, 0, sourceIndex, 0, 0, "gen.xol0")},
         {"OUTPUT_DETERMINISTIC_1D",
          "Number_Of_Records = 1\nOUTPUT_SPEC_DATA_1 {\nFile_Name = file(\"gauge.xol0\")\n"
          "NO_OF_POINTS = 1\nX_Range_And_Interval = " +
              std::to_string(gauge) + "\n" + span + "Number_Of_Items = 1\nItem_Numbers = 3\n}\n"},
         {"OUTPUT_MOVING_SHORELINE_1D",
          "INCLUDE_CALCULATION = true\nOUTPUT_SPEC_DATA_1 {\nFile_Name = file(\"runup.xol0\")\n" +
              span + "Number_Of_Items = 3\nItem_Numbers = 1, 2, 3\n}\n"}});
    bwtest::WriteFile(dir / "m.bw", bwtest::ModelText("bed.xol1", s));
    Runup r;
    r.exitCode =
        bwtest::RunProgram({bwtest::BuiltProgram("bw"), "m.bw"}, dir.path.string()).exitCode;
    if (r.exitCode != 0) return r;
    for (const auto& record : bwtest::ReadDataFile(dir / "gauge.xol0").records)
        r.incoming = std::max(r.incoming, static_cast<double>(record[0][0]));
    for (const auto& record : bwtest::ReadDataFile(dir / "runup.xol0").records)
        r.runup = std::max(r.runup, static_cast<double>(record[1][0]));
    return r;
}

// A non-breaking wave on 1:19.85 (H / d below 0.818 (cot beta)^(-10/9) =
// 0.031), at a grid and step a user would choose: 20 points over the
// wave's half-width 1 / K, a Courant number of 0.3. The slot lies 0.2 m
// under the still water: the slot adds L (w + 1/s) of depth to every node
// within L of its bottom, and a slot 1 m deep took 10 to 30 % off the
// runup. Its friction of 0.1 keeps the slot water under the dry beach from
// draining below the slot's bottom after the wave has gone back.
TEST(Runup, ASolitaryWaveClimbsAPlaneBeachAsTheRunupLawSays) {
    for (double H : {0.01}) {
        const Runup r = RunSolitaryWave(H, 0.05, 0.005);
        ASSERT_EQ(r.exitCode, 0) << H;
        const double law = 2.831 * std::sqrt(19.85) * std::pow(r.incoming, 1.25);
        std::printf("H/d target %.4f, arrived %.4f: runup %.4f m, law %.4f m (%+.1f %%)\n", H,
                    r.incoming, r.runup, law, 100.0 * (r.runup / law - 1.0));
        EXPECT_NEAR(r.runup / law, 1.0, 0.10) << H;
    }
}

}  // namespace
