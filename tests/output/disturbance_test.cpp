// Wave disturbance: the engine on a basin that waves enter through a gap in
// a breakwater, its map and area report checked against each other and the
// code map; each point's start and sums driven by a given surface; the stops
// of the section.
#include "output/disturbance.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <map>
#include <numbers>
#include <sstream>
#include <tuple>

#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"

namespace {

constexpr float kDelete = -1.0e-30f;

// The report: per output its heading (the line between the two rules) and
// per area code its maximum, mean, minimum, standard deviation and count.
struct Report {
    std::string heading;
    std::map<int, std::array<double, 5>> areas;
};
std::vector<Report> ReadReport(const std::string& path) {
    const char* labels[] = {
        "  Maximum value      :", "  Mean value         :", "  Minimum value      :",
        "  Standard deviation :", "  Number of data     :"};
    std::vector<Report> reports;
    const std::vector<std::string> lines = bwtest::ReadLines(path);
    const std::string rule(71, '-');
    int code = 0;
    for (size_t i = 0; i < lines.size(); ++i) {
        const std::string& l = lines[i];
        if (l == rule) {
            EXPECT_LT(i + 2, lines.size());
            EXPECT_EQ(lines[i + 2], rule);
            reports.push_back({lines[i + 1], {}});
            i += 2;
        } else if (l.rfind("     Area code: ", 0) == 0) {
            EXPECT_EQ(l.size(), 22u) << l;
            code = std::stoi(l.substr(16));
        } else if (!l.empty()) {
            EXPECT_EQ(l.size(), 30u) << l;
            const auto label = std::ranges::find(labels, l.substr(0, 22));
            if (reports.empty() || label == std::end(labels)) {
                ADD_FAILURE() << "unknown or early line: " << l;
                break;
            }
            reports.back().areas[code][label - labels] = std::stod(l.substr(22));
        }
    }
    return reports;
}

// A basin 12 m by 6.4 m of 0.2 m cells, 0.5 m deep, land all round. Waves
// of 1.6 s are born across it at j = 14 (a sponge behind, to the west) and
// reach a breakwater at j = 30, 31 with a gap at k = 13..18; behind lies
// the walled harbour, j = 32..58. Area codes: 1 in front of the breakwater
// (j = 16..29), 2 in the harbour and on the breakwater, 3 a corner of the
// harbour, 5 on the breakwater's ends only (land), -3 and 0 elsewhere.
class Disturbance : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    std::vector<float> bed, codes;
    static constexpr double kDt = 0.05;
    void SetUp() override {
        grid.J = 59, grid.K = 31, grid.dx = grid.dy = 0.2f;
        bed = bwtest::Constant(grid, -0.5f);
        codes = bwtest::Constant(grid, 0.0f);
        std::vector<float> sponge = bwtest::Constant(grid, 1.0f);
        for (int k = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j) {
                const size_t p = At(j, k);
                const bool breakwater = (j == 30 || j == 31) && (k < 13 || k > 18);
                if (j == 0 || k == 0 || j == grid.J || k == grid.K || breakwater) bed[p] = 1.0f;
                if (j < 12) sponge[p] = 1.0f + 0.5f * std::pow((12 - j) / 12.0f, 2.0f);
                codes[p] = j < 4                             ? -3.0f
                           : breakwater && (k < 3 || k > 28) ? 5.0f
                           : j >= 50 && k >= 24              ? 3.0f
                           : j >= 30                         ? 2.9f /* cut to 2 */
                           : j >= 16                         ? 1.0f
                                                             : 0.0f;
            }
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        bwtest::MapSpec other = grid;
        other.itemName = "Sponge";
        bwtest::WriteMapFile(dir / "sponge.xol2", other, sponge);
        other.itemName = "Area code";
        bwtest::WriteMapFile(dir / "codes.xol2", other, codes);
        // The line feeds each side with c a of flux for a wave of amplitude a.
        bwtest::WriteSeriesFile(
            dir / "waves.xol0", "2004-01-01 00:00:00", kDt,
            {bwtest::RampedSine(std::sqrt(9.81 * 0.5) * 0.02, 1.6, kDt, 650, 3.0)});
    }
    size_t At(int j, int k) const { return static_cast<size_t>(k) * (grid.J + 1) + j; }

    // The section: outputs from step 320 to 640 every 160 steps.
    static std::string Section(int type, const std::string& scaling, const std::string& items,
                               const std::string& file = "dist.xol2",
                               const std::string& area = "report.txt\")\n" +
                                                         bwtest::DataFileSection("codes.xol2")) {
        std::ostringstream s;
        s << "Type = " << type << "\nFirst_Time_Step = 160\nLast_Time_Step = 640\n"
          << "Time_Step_Interval = 160\nNumber_of_first_wave = 2\n"
          << scaling << "Number_of_Items = " << 1 + std::ranges::count(items, ',')
          << "\nItem_Numbers = " << items << "\nTitle = \"Harbour\"\nFile_Name = file(\"" << file
          << "\")\n"
          << "Type_of_Area_Statistic = 1\nFile_Name_Area_Statistic = file(\"" << area;
        return s.str();
    }
    bwtest::RunResult Run(const std::string& disturbance, int steps = 640) {
        return bwtest::RunModel(
            dir, steps, kDt,
            {{"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol2")},
             {"Internal_Generation",
              "Number_Of_Records = 1\nINTERNAL_GEN_DATA_1 {\nFirst_Line_Pos = 14, 1\n"
              "Last_Line_Pos = 14, 30\nWave_Type = 0\n" +
                  bwtest::DataFileSection("waves.xol0") + "}\n"},
             {"Output_Disturbance_2D", disturbance}});
    }
};

TEST_F(Disturbance, BasinBehindAGapMapsTheRatioAndReportsEachArea) {
    // All points start together; the height is taken in front of the gap.
    const size_t gauge = At(24, 15);
    bwtest::RunResult r = Run(Section(2, "Scaling_Type = 2\nGrid_Point = 24, 15\n", "3, 2, 1"));
    ASSERT_EQ(r.exitCode, 0) << r.out;
    const bwtest::DataFile byPoint = bwtest::ReadDataFile(dir / "dist.xol2");
    const std::vector<Report> reports = ReadReport(dir / "report.txt");

    // One map over the grid, the items in the order asked for, the bed as
    // its static item; records at 320, 480, 640 (16 s on, every 8 s).
    const XolFile& h = byPoint.header;
    ASSERT_EQ(h.noDynamicItems, 3);
    EXPECT_EQ(h.dynamicItems[0].name + "|" + h.dynamicItems[1].name + "|" + h.dynamicItems[2].name,
              "Time of first wave|Hm0/Hm0_incoming|Hm0");
    EXPECT_EQ(std::tuple(h.dimension, h.axes[0].count, h.axes[1].count, h.axes[0].spacing,
                         h.axes[1].origin, h.startDateTime, h.timeStep),
              std::tuple(2, 60, 32, 0.2f, 0.0f, std::string("2004-01-01 00:00:16"), 8.0));
    ASSERT_EQ(byPoint.records.size(), 3u);
    EXPECT_EQ(byPoint.firstStatic, bed);

    // The ratio is the height over the height at Grid_Point at that output.
    // Land has no value; every point started at step 161.
    for (const auto& record : byPoint.records) {
        const auto &start = record[0], &ratio = record[1], &height = record[2];
        ASSERT_GT(height[gauge], 0.01f);
        EXPECT_EQ(ratio[gauge], 1.0f);
        for (size_t p = 0; p < bed.size(); ++p) {
            EXPECT_FLOAT_EQ(start[p], static_cast<float>(161 * kDt));
            if (bed[p] >= 0.0f) {
                EXPECT_EQ(height[p], kDelete);
                EXPECT_EQ(ratio[p], kDelete);
            } else {
                EXPECT_GE(height[p], 1.0e-4f);
                EXPECT_NEAR(ratio[p], height[p] / height[gauge], 1e-6f * ratio[p]) << p;
            }
        }
    }
    // The waves came through the gap: sheltered, but not still.
    const auto& last = byPoint.records.back()[1];
    EXPECT_GT(last[At(45, 15)], 0.1f);
    EXPECT_LT(last[At(45, 3)], last[At(24, 3)]);

    // One report per output, headed by its step and time; the areas with
    // water points in rising order (not 5, only on land), each with the
    // numbers of the ratio map over its water points.
    ASSERT_EQ(reports.size(), 3u);
    for (int n = 0; n < 3; ++n) {
        char heading[80];
        std::snprintf(heading, sizeof heading,
                      " Wave disturbance coefficient at time step: %7d  2004-01-01 00:00:%02d",
                      320 + 160 * n, 16 + 8 * n);
        EXPECT_EQ(reports[n].heading, heading);
        ASSERT_EQ(reports[n].areas.size(), 3u);
        const auto& ratio = byPoint.records[n][1];
        for (const auto& [code, lines] : reports[n].areas) {
            double sum = 0, sum2 = 0, high = 0, low = 10;
            int count = 0;
            for (size_t p = 0; p < bed.size(); ++p)
                if (static_cast<int>(codes[p]) == code && bed[p] < 0.0f) {
                    sum += ratio[p], sum2 += ratio[p] * ratio[p], ++count;
                    high = std::max(high, static_cast<double>(ratio[p]));
                    low = std::min(low, static_cast<double>(ratio[p]));
                }
            ASSERT_GT(count, 1) << code;
            const double expected[] = {high, sum / count, low,
                                       std::sqrt((sum2 - sum * sum / count) / (count - 1)), 0.0};
            for (int i = 0; i < 4; ++i)
                EXPECT_NEAR(lines[i], expected[i], 6e-5) << code << ", " << i;
            EXPECT_EQ(lines[4], count) << code;
        }
    }
    EXPECT_EQ(reports[0].areas.begin()->first, 1);
    EXPECT_EQ(reports[0].areas.rbegin()->first, 3);
    // 14 x 30 points in front; the harbour's 27 x 30 and the gap's 2 x 6 less
    // the corner's 9 x 7.
    EXPECT_EQ(reports[0].areas.at(1)[4], 14 * 30);
    EXPECT_EQ(reports[0].areas.at(2)[4], 27 * 30 + 12 - 9 * 7);
    EXPECT_NE(bwtest::ReadFile(dir / "m.log").find("  Title  : Harbour"), std::string::npos);

    // A given height equal to the height at Grid_Point in the last record
    // gives that record's ratio map again.
    char given[80];
    std::snprintf(given, sizeof given, "Scaling_Type = 1\nIncoming_Wave_Height = %.9g\n",
                  byPoint.records.back()[2][gauge]);
    r = Run(Section(2, given, "3, 2, 1"));
    ASSERT_EQ(r.exitCode, 0) << r.out;
    const auto b = bwtest::ReadDataFile(dir / "dist.xol2").records.back()[1];
    for (size_t p = 0; p < last.size(); ++p) EXPECT_FLOAT_EQ(last[p], b[p]) << p;
}

TEST_F(Disturbance, StopsThatAModelFileCanReach) {
    const std::string point = "Scaling_Type = 2\nGrid_Point = 24, 15\n";
    bwtest::MapSpec small = grid;
    small.J = 40;
    bwtest::WriteMapFile(dir / "small.xol2", small, bwtest::Constant(small, 1.0f));
    const struct {
        std::string section, message;
    } cases[] = {
        {Section(1, point, "1, 4"), "rmsWriteToFile: Wrong type of item"},
        // The report's folder can't be made where a file stands.
        {Section(1, point, "2", "dist.xol2",
                 "bed.xol2/r.txt\")\n" + bwtest::DataFileSection("codes.xol2")),
         "Unable to create file " + dir.path.string() + "/bed.xol2/r.txt: Not a directory"},
        {Section(1, point, "2", "dist.xol2", "r.txt\")\n" + bwtest::DataFileSection("small.xol2")),
         "XOL data does not have the correct number of grid points (x.dir.): " +
             dir / "small.xol2" + ": 41 points where the grid has 60"},
        {Section(1, point, "1", "no/d.xol2"),
         "Unable to open " + dir.path.string() + "/no/d.xol2: no such file or directory"},
        {Section(1, "Scaling_Type = 0\nGrid_Point = 24, 32\n", "1"),
         "Output_Disturbance_2D: Grid_Point (24,32) lies outside the grid"},
    };
    for (const auto& c : cases) {
        const bwtest::RunResult r = Run(c.section, 2);
        EXPECT_EQ(r.exitCode, 1) << c.message;
        EXPECT_NE(r.out.find(c.message + "\n"), std::string::npos) << r.out;
        EXPECT_NE(bwtest::ReadFile(dir / "m.log").find("Abnormal completion"), std::string::npos);
    }
}

// The output driven in memory on a row, 1 m deep, land at 0: sines of
// period 8 steps and 0.05 m arriving at step 0 (A, and the drying point,
// 0.03 m deep) and step 8 (B), a tiny one and none; written every 10 steps.
class DisturbanceSums : public testing::Test {
protected:
    static constexpr int kA = 1, kB = 2, kTiny = 3, kStill = 4, kDrying = 5;
    static constexpr double kDt = 0.5;
    bwtest::TempDir dir;
    bwtest::LogCapture log;  // the summaries of the files
    std::vector<int32_t> samples, firstStep;
    static double Surface(int j, int n) {
        const int t = n - (j == kB ? 8 : 0);
        const float a = j == kTiny ? 1.0e-5f : (j == kStill ? 0.0f : 0.05f);
        return t <= 0 ? 0.0f : a * static_cast<float>(std::sin(2.0 * std::numbers::pi * t / 8.0));
    }
    void TearDown() override {
        gDisturbanceOutput = DisturbanceSettings{};
        gDisturbance = DisturbanceState{};
        ResetModelState();
    }
    // Steps 0..40 as the time loop drives them; the records of the file, the
    // samples and start steps of the points.
    bwtest::DataFile Drive(DisturbanceSettings s) {
        bwtest::MakeRow({1.0f, -1.0f, -1.0f, -1.0f, -1.0f, -0.03f, -1.0f}, kDt);
        s.firstStep = 0, s.lastStep = 40, s.stepInterval = 10, s.firstWave = 2;
        s.numberOfItems = static_cast<int32_t>(s.itemNumbers.size());
        s.fileName = dir / "d.xol2";
        gDisturbanceOutput = s;
        bwtest::DriveRow(40, Surface, [](int32_t n) {
            if (n == 0)
                InitOutputDisturbance(), CreateOutputDisturbance();
            else
                UpdateOutputDisturbance(n);
            WriteOutputDisturbance(n);
        });
        samples = gDisturbance.samples, firstStep = gDisturbance.firstStep;
        CloseOutputDisturbance();
        return bwtest::ReadDataFile(dir / "d.xol2");
    }
    // Hm0 of the surface of point j over the steps from..to, in 64 bits.
    static double Height(int j, int from, int to) {
        double s = 0, s2 = 0;
        const int n = to - from + 1;
        for (int m = from; m <= to; ++m) s += Surface(j, m), s2 += Surface(j, m) * Surface(j, m);
        return 4.0 * std::sqrt((s2 - s * s / n) / (n - 1));
    }
};

TEST_F(DisturbanceSums, EachPointStartsAtItsFirstWaveAndSumsItsOwnSteps) {
    // Type 1, given height 0.1 m: a sine arriving at step d starts at its
    // second trough and crest, d + 11. The tiny wave changes by less than
    // Eps_High times the height a step and never starts, nor the still point.
    DisturbanceSettings s;
    s.type = 1, s.scalingType = 1, s.incomingHeight = 0.1f, s.itemNumbers = {1, 3, 2};
    bwtest::DataFile f = Drive(s);
    EXPECT_EQ(firstStep[kA], 11);
    EXPECT_EQ(firstStep[kB], 19);
    EXPECT_EQ(firstStep[kDrying], 11);
    EXPECT_LT(firstStep[kTiny], 0);
    EXPECT_EQ(firstStep[kStill], -1);
    EXPECT_EQ(samples[kA], 30);
    EXPECT_EQ(samples[kB], 22);
    EXPECT_LT(samples[kDrying], 30);  // dry steps take no sample
    EXPECT_EQ(samples[0], 0);         // land
    ASSERT_EQ(f.records.size(), 4u);  // steps 10, 20, 30, 40

    // At step 40 each started point has the height of its own steps; the
    // drying point, having missed steps, has none; the ratio is over 0.1 m.
    const auto& at40 = f.records[3];
    EXPECT_NEAR(at40[0][kA], Height(kA, 11, 40), 1e-5);
    EXPECT_NEAR(at40[0][kB], Height(kB, 19, 40), 1e-5);
    EXPECT_GT(std::fabs(Height(kB, 9, 40) - Height(kB, 19, 40)), 1e-3);  // the check has weight
    EXPECT_NEAR(at40[2][kB], Height(kB, 19, 40) / 0.1, 1e-4);
    for (int j : {0, kTiny, kStill, kDrying}) EXPECT_EQ(at40[0][j], kDelete) << j;
    // Time of first wave: the start step in seconds, none where unstarted.
    EXPECT_FLOAT_EQ(at40[1][kA], 11 * kDt);
    EXPECT_FLOAT_EQ(at40[1][kB], 19 * kDt);
    EXPECT_EQ(at40[1][kTiny], kDelete);
    // At step 20 B has two samples: still a height; at 10 none had started.
    EXPECT_NEAR(f.records[1][0][kB], Height(kB, 19, 20), 1e-5);
    for (float v : f.records[0][0]) EXPECT_EQ(v, kDelete);

    // Type 3 restarts all sums after each output (steps 1, 11, 21, 31), the
    // tiny wave's too, whose height is the least, 1e-4. (Type 2 starts every
    // point at the first step: the basin's test.)
    s.type = 3;
    f = Drive(s);
    EXPECT_EQ(samples[kA], 10);
    EXPECT_EQ(firstStep[kTiny], 31);
    EXPECT_NEAR(f.records[3][0][kB], Height(kB, 31, 40), 1e-5);
    ASSERT_LT(Height(kTiny, 31, 40), 1e-4);
    EXPECT_FLOAT_EQ(f.records[3][0][kTiny], 1.0e-4f);
}

TEST_F(DisturbanceSums, HeightAtGridPointScalesFromItsFirstValue) {
    // Scaled by the height at B: before B has one (step 10) the ratio map is
    // empty, with one warning, and the first-wave test goes by the sign of
    // the change, so the tiny wave starts too. (The ratio once B has a
    // height: the basin's test.)
    DisturbanceSettings s;
    s.type = 1, s.scalingType = 2, s.gridPoint[0] = kB, s.itemNumbers = {1, 2};
    const bwtest::DataFile f = Drive(s);
    EXPECT_EQ(firstStep[kTiny], 11);
    for (float v : f.records[0][1]) EXPECT_EQ(v, kDelete);
    EXPECT_EQ(f.records[1][1][kB], 1.0f);
    const std::string text = log.Text();
    const std::string warning = "Warning: WriteOutputDisturbance: no incoming wave height";
    EXPECT_NE(text.find(warning), std::string::npos) << text;
    EXPECT_EQ(text.find(warning), text.rfind(warning));
}

}  // namespace
