// Wave disturbance: the engine run on a basin that waves enter through a
// gap in a breakwater, its map file and area report read back and checked
// against each other and against the code map; the start of each point and
// its sums driven by a surface given step by step; and the stops a model
// file can reach.
#include "output/disturbance.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <map>
#include <numbers>
#include <sstream>

#include "data/geoframe.hpp"
#include "data/xolfile.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;
constexpr float kDelete = -1.0e-30f;
constexpr double kPi = std::numbers::pi;

// A map file read back: the item names and every record of every item.
struct MapFile {
    std::vector<std::string> names;
    std::vector<std::vector<std::vector<float>>> records;  // [record][item][point]
    std::vector<float> bathymetry;
    XolFile header;
};
MapFile ReadMapFile(const std::string& path) {
    MapFile m;
    XolFile f = XolOpenRead(path);
    const size_t points = static_cast<size_t>(f.axes[0].count) * f.axes[1].count;
    for (const XolItem& item : f.dynamicItems) m.names.push_back(item.name);
    m.bathymetry.resize(points);
    if (f.noStaticItems == 1) XolReadStatic(f, m.bathymetry.data());
    m.records.resize(static_cast<size_t>(std::max(f.noTimeSteps, 0)));
    for (auto& record : m.records) {
        record.assign(static_cast<size_t>(f.noDynamicItems), std::vector<float>(points));
        for (auto& item : record) XolReadDynamic(f, item.data());
    }
    XolClose(f);
    m.header = f;
    return m;
}

// One area of one report.
struct AreaLines {
    double maximum = 0, mean = 0, minimum = 0, deviation = 0;
    int count = 0;
};
struct Report {
    std::string heading;  // the line between the two rules
    std::map<int, AreaLines> areas;
};

// Splits the report into its steps; every line is checked for its columns.
std::vector<Report> ReadReport(const std::string& path) {
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
            EXPECT_FALSE(reports.empty());
            if (reports.empty()) break;
            AreaLines& a = reports.back().areas[code];
            const std::string label = l.substr(0, 22), value = l.substr(22);
            if (label == "  Maximum value      :")
                a.maximum = std::stod(value);
            else if (label == "  Mean value         :")
                a.mean = std::stod(value);
            else if (label == "  Minimum value      :")
                a.minimum = std::stod(value);
            else if (label == "  Standard deviation :")
                a.deviation = std::stod(value);
            else if (label == "  Number of data     :")
                a.count = std::stoi(value);
            else
                ADD_FAILURE() << "unknown line: " << l;
        }
    }
    return reports;
}

// A basin 12 m by 6.4 m of 0.2 m cells, 0.5 m deep, land all round. Waves
// of 1.6 s are born on a line across it at j = 14 (a sponge behind it, at
// the west end) and reach a breakwater at j = 30, 31 with a gap at
// k = 13..18; behind it lies the harbour basin, j = 32..58, walled.
// Area codes: 1 in front of the breakwater (j = 16..29), 2 in the harbour
// and on the breakwater, 3 a corner of the harbour, 5 on the breakwater's
// ends only (land), -3 and 0 elsewhere.
class Disturbance : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    std::vector<float> bed, codes;
    static constexpr double kPeriod = 1.6, kDt = 0.05;
    static constexpr int kSteps = 640;
    void SetUp() override {
        grid.J = 59, grid.K = 31, grid.dx = grid.dy = 0.2f;
        bed = bwtest::Constant(grid, -0.5f);
        codes = bwtest::Constant(grid, 0.0f);
        std::vector<float> sponge = bwtest::Constant(grid, 1.0f);
        for (int k = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j) {
                const size_t p = At(j, k);
                const bool frame = j == 0 || k == 0 || j == grid.J || k == grid.K;
                const bool breakwater = (j == 30 || j == 31) && (k < 13 || k > 18);
                if (frame || breakwater) bed[p] = 1.0f;
                if (j < 12) sponge[p] = 1.0f + 0.5f * std::pow((12 - j) / 12.0f, 2.0f);
                if (j >= 16 && j <= 29) codes[p] = 1.0f;
                if (j >= 30) codes[p] = 2.9f;  // cut to 2
                if (j >= 50 && k >= 24) codes[p] = 3.0f;
                if (breakwater && (k < 3 || k > 28)) codes[p] = 5.0f;
                if (j < 4) codes[p] = -3.0f;
            }
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        bwtest::MapSpec other = grid;
        other.itemName = "Sponge";
        bwtest::WriteMapFile(dir / "sponge.xol2", other, sponge);
        other.itemName = "Area code";
        bwtest::WriteMapFile(dir / "codes.xol2", other, codes);
        // The line feeds each side with c a of flux for a wave of amplitude a.
        const double c = std::sqrt(9.81 * 0.5);
        bwtest::WriteSeriesFile(dir / "waves.xol0", "2004-01-01 00:00:00", kDt,
                                {bwtest::RampedSine(c * 0.02, kPeriod, kDt, kSteps + 10, 3.0)});
    }
    size_t At(int j, int k) const { return static_cast<size_t>(k) * (grid.J + 1) + j; }

    // The section: outputs from step 320 to 640 every 160 steps.
    static std::string Section(int type, const std::string& scaling, const std::string& items,
                               const std::string& area = "") {
        const int count = 1 + static_cast<int>(std::count(items.begin(), items.end(), ','));
        std::ostringstream s;
        s << "Type = " << type << "\nFirst_Time_Step = 160\nLast_Time_Step = 640\n"
          << "Time_Step_Interval = 160\nNumber_of_first_wave = 2\n"
          << scaling << "Number_of_Items = " << count << "\nItem_Numbers = " << items
          << "\nTitle = \"Harbour\"\nFile_Name = file(\"dist.xol2\")\n";
        if (area.empty())
            s << "Type_of_Area_Statistic = 1\nFile_Name_Area_Statistic = file(\"report.txt\")\n"
              << bwtest::DataFileSection("codes.xol2");
        else
            s << area;
        return s.str();
    }
    bwtest::RunResult Run(const std::string& disturbance, int steps = kSteps) {
        Sections all;
        all["Simulation_Period"] = "Time_step_count = " + std::to_string(steps) +
                                   "\nTime_step_interval = 0.05\nWarm_up_period = 0\n"
                                   "Start_time = 2004, 1, 1, 0, 0, 0\n";
        all["Sponge"] = "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol2");
        all["Internal_Generation"] =
            "Number_Of_Records = 1\nINTERNAL_GEN_DATA_1 {\nFirst_Line_Pos = 14, 1\n"
            "Last_Line_Pos = 14, 30\nWave_Type = 0\n" +
            bwtest::DataFileSection("waves.xol0") + "}\n";
        all["Output_Disturbance_2D"] = disturbance;
        bwtest::WriteFile(dir / "m.bw", bwtest::ModelText("bed.xol2", all));
        return bwtest::RunProgram({bwtest::BuiltProgram("bw"), "m.bw"}, dir.path.string(),
                                  {{"TARN_PROGRESS", "NONE"}}, {"BUILDMODE", "TRF"});
    }
};

TEST_F(Disturbance, BasinBehindAGapMapsTheRatioAndReportsEachArea) {
    // All points start together; the height is taken in front of the gap.
    const int gj = 24, gk = 15;
    const std::string point = "Scaling_Type = 2\nGrid_Point = 24, 15\n";
    bwtest::RunResult r = Run(Section(2, point, "3, 2, 1"));
    ASSERT_EQ(r.exitCode, 0) << r.out;
    const MapFile byPoint = ReadMapFile(dir / "dist.xol2");
    const std::vector<Report> reports = ReadReport(dir / "report.txt");
    const std::string log = bwtest::ReadFile(dir / "m.log");

    // One map over the whole grid with the items in the order asked for, the
    // bed as its static item; records at 320, 480, 640 (16 s on, every 8 s).
    const XolFile& h = byPoint.header;
    EXPECT_EQ(byPoint.names,
              (std::vector<std::string>{"Time of first wave", "Hm0/Hm0_incoming", "Hm0"}));
    EXPECT_EQ(h.dimension, 2);
    EXPECT_EQ(h.axes[0].count, 60);
    EXPECT_EQ(h.axes[1].count, 32);
    EXPECT_FLOAT_EQ(h.axes[0].spacing, 0.2f);
    EXPECT_FLOAT_EQ(h.axes[1].origin, 0.0f);
    EXPECT_EQ(h.startDateTime, "2004-01-01 00:00:16");
    EXPECT_DOUBLE_EQ(h.timeStep, 8.0);
    ASSERT_EQ(byPoint.records.size(), 3u);
    EXPECT_EQ(byPoint.bathymetry, bed);

    // The ratio is the height over the height at Grid_Point at that output:
    // 1 there, and the same map as the heights scaled. Land has no value,
    // and every point started at step 161.
    for (const auto& record : byPoint.records) {
        const auto &start = record[0], &ratio = record[1], &height = record[2];
        const float incoming = height[At(gj, gk)];
        ASSERT_GT(incoming, 0.01f);
        EXPECT_EQ(ratio[At(gj, gk)], 1.0f);
        for (size_t p = 0; p < bed.size(); ++p) {
            EXPECT_FLOAT_EQ(start[p], static_cast<float>(161 * kDt));
            if (bed[p] >= 0.0f) {
                EXPECT_EQ(height[p], kDelete);
                EXPECT_EQ(ratio[p], kDelete);
                continue;
            }
            EXPECT_GE(height[p], 1.0e-4f);
            EXPECT_NEAR(ratio[p], height[p] / incoming, 1e-6f * ratio[p]) << p;
        }
    }
    // The waves came through the gap: sheltered, but not still.
    const auto& last = byPoint.records.back()[1];
    EXPECT_GT(last[At(45, 15)], 0.1f);
    EXPECT_LT(last[At(45, 3)], last[At(24, 3)]);

    // The report: one per output, a heading with the step and its time, the
    // areas that have water points in rising order (not 5, only on land),
    // each with the numbers of the ratio map over its water points.
    ASSERT_EQ(reports.size(), 3u);
    const char* headings[] = {"2004-01-01 00:00:16", "2004-01-01 00:00:24", "2004-01-01 00:00:32"};
    for (int n = 0; n < 3; ++n) {
        char heading[80];
        std::snprintf(heading, sizeof heading,
                      " Wave disturbance coefficient at time step: %7d  %s", 320 + 160 * n,
                      headings[n]);
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
            EXPECT_EQ(lines.count, count) << code;
            EXPECT_NEAR(lines.maximum, high, 6e-5) << code;
            EXPECT_NEAR(lines.mean, sum / count, 6e-5) << code;
            EXPECT_NEAR(lines.minimum, low, 6e-5) << code;
            EXPECT_NEAR(lines.deviation, std::sqrt((sum2 - sum * sum / count) / (count - 1)), 6e-5)
                << code;
        }
    }
    EXPECT_EQ(reports[0].areas.begin()->first, 1);
    EXPECT_EQ(reports[0].areas.rbegin()->first, 3);
    // 14 x 30 points in front; the harbour's 27 x 30 and the gap's 2 x 6 less
    // the corner's 9 x 7.
    EXPECT_EQ(reports[0].areas.at(1).count, 14 * 30);
    EXPECT_EQ(reports[0].areas.at(2).count, 27 * 30 + 12 - 9 * 7);
    // The map file is closed and summarised in the log.
    EXPECT_NE(log.find("  Title  : Harbour"), std::string::npos);

    // The given height equal to the height at Grid_Point in the last record
    // gives that record's ratio map and report again, 1 at the point.
    char given[80];
    std::snprintf(given, sizeof given, "Scaling_Type = 1\nIncoming_Wave_Height = %.9g\n",
                  byPoint.records.back()[2][At(gj, gk)]);
    r = Run(Section(2, given, "3, 2, 1"));
    ASSERT_EQ(r.exitCode, 0) << r.out;
    const MapFile byHeight = ReadMapFile(dir / "dist.xol2");
    ASSERT_EQ(byHeight.records.size(), 3u);
    const auto& a = byPoint.records.back()[1];
    const auto& b = byHeight.records.back()[1];
    for (size_t p = 0; p < a.size(); ++p) EXPECT_FLOAT_EQ(a[p], b[p]) << p;
    EXPECT_FLOAT_EQ(b[At(gj, gk)], 1.0f);
    const std::vector<Report> again = ReadReport(dir / "report.txt");
    ASSERT_EQ(again.size(), 3u);
    for (const auto& [code, lines] : reports.back().areas) {
        EXPECT_EQ(again.back().areas.at(code).mean, lines.mean);
        EXPECT_EQ(again.back().areas.at(code).deviation, lines.deviation);
    }
}

TEST_F(Disturbance, StopsThatAModelFileCanReach) {
    const std::string point = "Scaling_Type = 2\nGrid_Point = 24, 15\n";
    bwtest::MapSpec small = grid;
    small.J = 40;
    bwtest::WriteMapFile(dir / "small.xol2", small, bwtest::Constant(small, 1.0f));
    const std::string report = "Type_of_Area_Statistic = 1\nFile_Name_Area_Statistic = file(\"";
    const struct {
        std::string section, message;
    } cases[] = {
        {Section(1, point, "1, 4"), "rmsWriteToFile: Wrong type of item"},
        // The report's folder can't be made where a file stands.
        {Section(1, point, "2",
                 report + "bed.xol2/r.txt\")\n" + bwtest::DataFileSection("codes.xol2")),
         "Unable to create file " + dir.path.string() + "/bed.xol2/r.txt"},
        {Section(1, point, "2", report + "r.txt\")\n" + bwtest::DataFileSection("small.xol2")),
         "XOL data does not have the correct number of grid points (x.dir.)"},
        {Section(1, point, "1").replace(Section(1, point, "1").find("dist.xol2"), 9, "no/d.xol2"),
         "Unable to open " + dir.path.string() + "/no/d.xol2"},
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

// The output driven in memory: a grid of one row, 1 m deep, whose points
// see sines of period 8 steps and amplitude 0.05 m that arrive at
// different steps, a tiny one, and none; written every 10 steps to step 40.
class DisturbanceSums : public testing::Test {
protected:
    bwtest::TempDir dir;
    static constexpr int kA = 1, kB = 2, kTiny = 3, kStill = 4, kDrying = 5;
    static constexpr double kDt = 0.5;
    // The step at which the wave of a point arrives.
    static int Arrival(int j) { return j == kB ? 8 : 0; }
    static float Amplitude(int j) { return j == kTiny ? 1.0e-5f : (j == kStill ? 0.0f : 0.05f); }
    static float Surface(int j, int n) {
        const int t = n - Arrival(j);
        return t <= 0 ? 0.0f : Amplitude(j) * static_cast<float>(std::sin(2.0 * kPi * t / 8.0));
    }
    void SetUp() override {
        ResetModelState();
        GridState& g = gGrid;
        g.J = 6, g.K = 0, g.dx = g.dy = 1.0f, g.dt = kDt;
        g.bed.assign(g.Points(), -1.0f);
        g.bed[kDrying] = -0.03f;  // dries in the troughs
        g.bed[0] = 1.0f;
        AllocateModelState();
        GeoFrameOpen(g.frame, "NON-UTM", 0.0, 0.0, 0.0);
    }
    void TearDown() override {
        gDisturbanceOutput = DisturbanceSettings{};
        gDisturbance = DisturbanceState{};
        ResetModelState();
    }
    // Runs steps 1..40 with the settings, as the time loop does; returns the
    // records of the file and leaves the sums in gDisturbance unfreed.
    MapFile Drive(const DisturbanceSettings& settings) {
        gDisturbanceOutput = settings;
        gDisturbanceOutput.firstStep = 0, gDisturbanceOutput.lastStep = 40;
        gDisturbanceOutput.stepInterval = 10;
        gDisturbanceOutput.firstWave = 2;
        gDisturbanceOutput.numberOfItems = static_cast<int32_t>(settings.itemNumbers.size());
        gDisturbanceOutput.fileName = dir / "d.xol2";
        GridState& g = gGrid;
        InitOutputDisturbance();
        CreateOutputDisturbance();
        WriteOutputDisturbance(0);
        for (int n = 1; n <= 40; ++n) {
            for (int j = 0; j <= g.J; ++j) {
                g.xiPrev2[j] = g.xi[j];
                g.xi[j] = g.bed[j] < 0.0f ? Surface(j, n) : 0.0f;
            }
            UpdateOutputDisturbance(n);
            WriteOutputDisturbance(n);
        }
        samples = gDisturbance.samples, firstStep = gDisturbance.firstStep;
        CloseOutputDisturbance();
        return ReadMapFile(dir / "d.xol2");
    }
    std::vector<int32_t> samples, firstStep;
    // Hm0 of the surface of point j over the steps from..to, in 64 bits.
    static double Height(int j, int from, int to) {
        double s = 0, s2 = 0;
        const int n = to - from + 1;
        for (int m = from; m <= to; ++m) s += Surface(j, m), s2 += Surface(j, m) * Surface(j, m);
        return 4.0 * std::sqrt((s2 - s * s / n) / (n - 1));
    }
};

TEST_F(DisturbanceSums, EachPointStartsAtItsFirstWaveAndSumsItsOwnSteps) {
    // Type 1 with a given height of 0.1 m: a sine arriving at step d rises
    // from d + 1, falls from d + 3, rises from d + 7 and falls from d + 11,
    // its second trough and crest: there it starts. The tiny wave changes by
    // less than Eps_High times the height a step and never starts, nor does
    // the still point.
    bwtest::LogCapture log;  // the summaries of the files
    DisturbanceSettings s;
    s.type = 1, s.scalingType = 1, s.incomingHeight = 0.1f, s.itemNumbers = {1, 3, 2};
    MapFile f = Drive(s);
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

    // Type 3: all sums restart after each output (steps 1, 11, 21, 31), so
    // the record at 40 holds steps 31..40 of every wet point, the tiny wave's
    // too. Any other Type starts every point at step 1.
    s.type = 3;
    f = Drive(s);
    EXPECT_EQ(samples[kA], 10);
    EXPECT_EQ(firstStep[kTiny], 31);
    EXPECT_NEAR(f.records[3][0][kB], Height(kB, 31, 40), 1e-5);
    EXPECT_NEAR(f.records[3][0][kTiny], std::max(Height(kTiny, 31, 40), 1e-4), 1e-9);
    s.type = 2;
    f = Drive(s);
    EXPECT_EQ(samples[kB], 40);
    EXPECT_EQ(firstStep[kStill], 1);
    EXPECT_NEAR(f.records[3][0][kB], Height(kB, 1, 40), 1e-5);
    EXPECT_FLOAT_EQ(f.records[3][0][kStill], 1.0e-4f);  // no variance: the least height
}

TEST_F(DisturbanceSums, HeightAtGridPointScalesFromItsFirstValue) {
    // Scaling by the height at B: before B has one (steps 10) the ratio map
    // is empty, with one warning; the first-wave test meanwhile goes by the
    // sign of the change, so the tiny wave starts as well. From step 20 on
    // B's ratio is 1 and A's is its height over B's.
    bwtest::LogCapture log;
    DisturbanceSettings s;
    s.type = 1, s.scalingType = 2, s.gridPoint[0] = kB, s.itemNumbers = {1, 2};
    const MapFile f = Drive(s);
    EXPECT_EQ(firstStep[kTiny], 11);
    for (float v : f.records[0][1]) EXPECT_EQ(v, kDelete);
    for (size_t r = 1; r < 4; ++r) {
        EXPECT_EQ(f.records[r][1][kB], 1.0f) << r;
        EXPECT_FLOAT_EQ(f.records[r][1][kA], f.records[r][0][kA] / f.records[r][0][kB]) << r;
    }
    const std::string text = log.Text();
    const std::string warning = "Warning: WriteOutputDisturbance: no incoming wave height";
    EXPECT_NE(text.find(warning), std::string::npos) << text;
    EXPECT_EQ(text.find(warning), text.rfind(warning));
}

}  // namespace
