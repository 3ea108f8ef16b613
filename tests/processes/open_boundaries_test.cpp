// Open boundaries: which side of the water a line closes, the series with its
// interpolation and warm-up ramp, the tables the sweeps read for every
// formulation and kind of data, and the files that are refused.
#include "processes/open_boundaries.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <limits>
#include <sstream>

#include "data/tsfunc.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "solver2d/model_state.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

constexpr const char* kStart = "2004-01-01 00:00:00";

// One BOUNDARY_DATA_% section.
struct Line {
    int j1, k1, j2, k2;
    int formulation = 0;
    int dataSpecification = 0;
    std::string file = "level.xol0";
    int items = 1;
};

class Boundaries : public testing::Test {
protected:
    bwtest::TempDir dir;
    void SetUp() override {
        ResetModelState();
        TsReset();
        gBasic = BasicSettings{};
        gEquation = EquationSettings{};
        GridState& g = gGrid;
        // A basin of 1 m depth, 9 x 7 points of 1 m by 2 m, land all round.
        g.J = 8, g.K = 6, g.dx = 1.0f, g.dy = 2.0f;
        g.bed.assign(g.Points(), -1.0f);
        for (int k = 0; k <= g.K; ++k)
            for (int j = 0; j <= g.J; ++j)
                if (j == 0 || k == 0 || j == g.J || k == g.K) g.bed[g.At(j, k)] = 1.0f;
        g.dt = 0.1, g.timeStepCount = 20;
        g.start = MakeDateTime(2004, 1, 1, 0, 0, 0);
        AllocateModelState();
        TsInit(g.timeStepCount + 1);
        // A level series file: item 1 rises by 1 a second, item 2 is 10 times item 1.
        std::vector<float> a, b;
        for (int n = 0; n <= 10; ++n) a.push_back(0.5f * n), b.push_back(5.0f * n);
        bwtest::WriteSeriesFile(dir / "level.xol0", kStart, 0.5, {a, b});
        setenv("TRF", "HUD", 1);  // stop texts go to standard error, where death tests read them
    }
    void TearDown() override {
        unsetenv("TRF");
        for (BoundaryLineFile& l : gBoundaries.lineFiles)
            if (l.file.mode == 1) XolClose(l.file);
        gBoundaries = BoundaryState{};
        TsReset();
    }
    void Setup(const std::vector<Line>& lines) {
        std::ostringstream s;
        s << "M {\nBoundary_Location {\nNumber_Of_Boundaries = " << lines.size() << "\n";
        for (size_t i = 0; i < lines.size(); ++i) {
            const Line& l = lines[i];
            s << "BOUNDARY_DATA_" << i + 1 << " {\nFirst_Point = " << l.j1 << ", " << l.k1
              << "\nLast_Point = " << l.j2 << ", " << l.k2 << "\nFormulation = " << l.formulation
              << "\nData_Specification = " << l.dataSpecification
              << "\nDATA_FILE {\nFile_name = file(\"" << l.file << "\")\nItem_Count = " << l.items
              << "\nItem_Numbers = 1, 2\n}\n}\n";
        }
        s << "}\n}\n";
        bwtest::WriteFile(dir / "m.bw", s.str());
        KvtHandle file = KvtOpenFile(dir / "m.bw", false);
        SetupOpenBoundaries(KvtOpenTarget(file, "M"));
        kvtClose(&file);
    }
    void Land(int j, int k) { gGrid.bed[gGrid.At(j, k)] = 1.0f; }
    // A line file of six records every 0.5 s from the start: record n holds
    // 10 n + s at point s in item 1, 100 more in item 2, 200 more in item 3.
    void LineFile(const std::string& name, int items, int points, float spacing, int type = 0) {
        std::vector<std::vector<std::vector<float>>> v(items);
        for (int i = 0; i < items; ++i)
            for (int n = 0; n < 6; ++n) {
                v[i].emplace_back(points);
                for (int s = 0; s < points; ++s) v[i][n][s] = 10.0f * n + s + 100.0f * i;
            }
        bwtest::WriteLineFile(dir / name, kStart, 0.5, spacing, v, type);
    }
    // Steps from..to as the time loop makes them.
    void Steps(int from, int to) {
        for (int s = from; s <= to; ++s) {
            TsReadStep(s);
            UpdateBoundaryData(s);
        }
    }
};

using BoundariesDeathTest = Boundaries;

TEST_F(Boundaries, SeriesAreInterpolatedCubicallyAndRampedFromTheSurfaceAtTheLineMiddle) {
    // A quadratic is what the cubic reproduces exactly, ends included; the
    // file's step is five model steps and starts a second before the run.
    auto f = [](double t) { return 1.0 + 0.5 * t - 0.2 * t * t; };
    std::vector<float> quad;
    for (int n = 0; n <= 7; ++n) quad.push_back(static_cast<float>(f(-1.0 + 0.5 * n)));
    bwtest::WriteSeriesFile(dir / "q.xol0", "2003-12-31 23:59:59", 0.5, {quad});
    const int32_t item = 1, cubic = 2;
    std::vector<float> s;
    ReadTimeSeries0D(dir / "q.xol0", 1, &item, &cubic, s);
    ASSERT_EQ(s.size(), 21u);
    for (int n = 0; n <= 20; ++n) EXPECT_NEAR(s[n], f(n * 0.1), 2e-6) << n;

    // Over a warm-up of 20 steps the level (t) rises from the surface at the
    // middle of the line, the deep-water value (10 t) from 0.
    GridState& g = gGrid;
    g.timeStepCount = 40, g.warmUpPeriod = 20;
    TsReset();
    TsInit(g.timeStepCount + 1);
    std::fill(g.xi.begin(), g.xi.end(), 0.2f);
    g.xi[g.At(0, 3)] = 0.4f;  // the middle of the line (0,1)..(0,5)
    gEquation.deepWaterTerms = true;
    Setup({{0, 1, 0, 5, 0, 0, "level.xol0", 2}});
    const float rise = (1.0f + std::sin(-0.9f * 1.570796f)) / 2.0f;  // at step 1
    const struct {
        int step;
        float level, deep;
    } cases[] = {{1, 0.4f + (0.1f - 0.4f) * rise, rise}, {10, 0.7f, 5.0f}, {30, 3.0f, 30.0f}};
    int done = 0;
    for (const auto& c : cases) {
        Steps(done + 1, c.step), done = c.step;
        EXPECT_NEAR(BoundaryValues(1).Value(0, 1), c.level, 1e-5f) << c.step;
        EXPECT_NEAR(BoundaryValues(1).Value(0, 5), c.deep, 1e-4f) << c.step;
    }
}

TEST_F(Boundaries, EveryKindOfLineFindsItsSideAndFillsItsTable) {
    LineFile("flux.xol1", 1, 5, 2.0f);
    LineFile("hot.xol1", 3, 7, 1.0f, 1);  // water depth, P, Q
    // An inner wall of land along j = 2 with water east of it, and a bay of
    // one point at (6,3) closed on three sides.
    for (int k = 1; k <= 5; ++k) Land(2, k);
    Land(6, 2), Land(6, 4), Land(7, 3);
    std::fill(gGrid.xi.begin(), gGrid.xi.end(), 0.2f);
    gEquation.deepWaterTerms = true;
    Setup(
        {{0, 5, 0, 1, 0, 0, "level.xol0", 2},  // 1: level from a series, west edge, high end first
         {8, 1, 8, 5, 1, 0, "level.xol0", 2},  // 2: flux from a series, east edge
         {3, 1, 3, 5, 1, 1, "flux.xol1"},      // 3: flux from a line file, land to the west
         {7, 0, 1, 0, 0, 2, "hot.xol1"},       // 4: level from hot transfer data, south edge
         {1, 6, 7, 6, 1, 2, "hot.xol1"},       // 5: flux from hot transfer data, north edge
         {6, 3, 6, 3, 0, 0, "level.xol0", 2},  // 6: the bay, only its west neighbour water
         {4, 6, 4, 6, 0, 0, "level.xol0", 2}});  // 7: a single point of the north edge
    // The side of the water each line closes (1 west, 2 north, 3 east, 4
    // south) and a row of the table for each point, the ends sorted.
    const int sides[7] = {1, 3, 1, 4, 2, 3, 2}, rows[7] = {5, 5, 5, 7, 7, 1, 1};
    for (int b = 1; b <= 7; ++b) {
        EXPECT_EQ(Boundary(b).orientation, sides[b - 1]) << b;
        EXPECT_EQ(BoundaryValues(b).rows, rows[b - 1]) << b;
    }
    // Step 1 at t = 0.1 s: series item 1 is 0.1, item 2 is 1; step 7 at
    // t = 0.7 s lies 0.4 of the way from record 1 to record 2 of a line file.
    const struct {
        int step, boundary, row, column;
        float value;
    } cases[] = {
        {1, 1, 2, 2, (0.2f + 0.1f) / 2},  // the mean of the surface and the level
        {1, 1, 2, 6, 1.0f},               // the deep-water value: at step 1 no earlier one
        {1, 2, 4, 1, 0.1f},
        {2, 1, 0, 6, 1.5f},  // the mean with the one of a step earlier
        {7, 3, 3, 1, 14.0f + 3.0f},
        {7, 4, 6, 2, 0.1f + 20.0f},  // half the surface and the water depth
        {7, 4, 6, 4, 120.0f},        // P
        {7, 5, 0, 1, 114.0f},
        {20, 3, 0, 1, 40.0f},  // t = 2 s, record 4
    };
    int done = 0;
    for (const auto& c : cases) {
        if (c.step > done) Steps(done + 1, c.step), done = c.step;
        EXPECT_NEAR(BoundaryValues(c.boundary).Value(c.row, c.column), c.value, 1e-4f)
            << "step " << c.step << " boundary " << c.boundary << " at " << c.row << c.column;
    }
}

TEST_F(BoundariesDeathTest, LinesSettingsAndFilesThatDoNotFitStop) {
    LineFile("two.xol1", 2, 5, 2.0f);
    LineFile("cold.xol1", 3, 5, 2.0f);
    LineFile("dx.xol1", 1, 7, 2.0f);
    LineFile("dy.xol1", 1, 5, 1.0f);
    LineFile("count.xol1", 1, 4, 2.0f);
    // Series for the 20 steps of 0.1 s, which need records from 0 to 2 s.
    bwtest::WriteSeriesFile(dir / "exact.xol0", kStart, 0.5, {std::vector<float>(5, 1.0f)});
    bwtest::WriteSeriesFile(dir / "short.xol0", kStart, 0.5, {std::vector<float>(4, 1.0f)});
    // A series on a relative time axis has no date to meet the run's start.
    XolFile relative = XolCreateHeader("Relative", 1, 0);
    XolSetItem(relative, 1, 100078, "Level", 1000);
    xolSetEqTimeAxis(relative.header, 1400, 0.0, 0.5, 0);
    XolCreateFile(relative, dir / "relative.xol0");
    for (float v : {0.0f, 1.0f, 2.0f, 3.0f, 4.0f, 5.0f}) XolWriteDynamic(relative, &v);
    XolClose(relative);
    const struct {
        Line line;
        const char* message;
        int set = 0;  // 1: the deep water terms, 2: another handling of the convective terms
    } cases[] = {
        {{1, 1, 3, 3}, "Boundary line is skew to the grid"},
        {{4, 1, 4, 5}, "Boundary line is skew to the grid"},  // water on both sides
        {{1, 1, 1, 1}, "Boundary line is skew to the grid"},  // an inner point, two land neighbours
        {{0, 1, 0, 9},
         "SetupOpenBoundaries: boundary 1 has a point outside the grid \\(0..8,0..6\\)"},
        {{0, 1, 0, 5, 2}, "Boundary formulation is unknown"},
        {{0, 1, 0, 5, 0, 3}, "Boundary specification is unknown"},
        {{0, 1, 0, 5},
         "Only central differencing with side-feeding is allow using open boundaries",
         2},
        {{0, 1, 0, 5}, "SetupOpenBoundaries: the deep water terms need two items in the series", 1},
        // Each after its text with the file and what was found there.
        {{0, 1, 0, 5, 0, 0, "short.xol0"},
         "XOL data does not cover the simulation period: .*/short.xol0: it runs from 0 s to .* s "
         "of the run in [0-9]+ records, the run from 0 s to"},
        {{0, 1, 0, 5, 0, 0, "exact.xol0", 2},
         "XOL data does not contain the correct number of items"},
        {{0, 1, 0, 5, 0, 0, "two.xol1"}, "XOL data is not 0D: .*/two.xol1: it has 1 spatial axis"},
        {{0, 1, 0, 5, 0, 0, "relative.xol0"},
         "XOL data does not contain a calendar time axis: .*/relative.xol0: its time axis counts "
         "from no date"},
        {{0, 1, 0, 5, 1, 1, "level.xol0"}, "XOL data is not 1D"},
        {{0, 1, 0, 5, 1, 1, "two.xol1"}, "XOL data does not contain the correct number of items"},
        {{0, 1, 0, 5, 1, 2, "cold.xol1"},
         "XOL data is not hot transfer data: .*/cold.xol1: its data-type flag is 0, not 1"},
        {{1, 0, 7, 0, 1, 1, "dx.xol1"},
         "XOL data does not have the correct grid spacing \\(x-dir.\\)"},
        {{0, 1, 0, 5, 1, 1, "dy.xol1"},
         "XOL data does not have the correct grid spacing \\(y-dir.\\)"},
        {{0, 1, 0, 5, 1, 1, "count.xol1"},
         "XOL data does not have the correct number of grid points \\(x.dir.\\)"},
    };
    for (const auto& c : cases) {
        gEquation.deepWaterTerms = c.set == 1;
        gEquation.convectiveHandle = c.set == 2 ? 1 : 0;
        EXPECT_EXIT(Setup({c.line}), testing::ExitedWithCode(1), c.message) << c.line.file;
    }
    gEquation = EquationSettings{};
    // A series that ends at the run's end will do, and the last step reads it.
    Setup({{0, 1, 0, 5, 0, 0, "exact.xol0"}});
    Steps(1, 20);
    EXPECT_FLOAT_EQ(BoundaryValues(1).Value(0, 1), 1.0f);
}

// A value that is not a finite number stops the setup with the file, the
// item, the step and the point: in the series where the run reads it, and in
// a line file at any record up to the end of the run, though it would only be
// read then; a record the run does not need may hold anything.
TEST_F(BoundariesDeathTest, ValuesThatAreNoNumbersStopTheSetupWhereverTheRunReadsThem) {
    const float nan = std::numeric_limits<float>::quiet_NaN();
    std::vector<float> level(5, 1.0f);
    level[3] = nan;
    bwtest::WriteSeriesFile(dir / "nan.xol0", kStart, 0.5, {level});
    // Records every 0.5 s up to 4.5 s, for a run of 2 s: the last needed is at 2 s.
    std::vector<std::vector<std::vector<float>>> line(
        1, std::vector<std::vector<float>>(10, std::vector<float>(5, 1.0f)));
    line[0][4][2] = -std::numeric_limits<float>::infinity();
    bwtest::WriteLineFile(dir / "late.xol1", kStart, 0.5, 2.0f, line);
    line[0][4][2] = 1.0f;
    line[0][8][2] = nan;
    bwtest::WriteLineFile(dir / "after.xol1", kStart, 0.5, 2.0f, line);
    EXPECT_EXIT(Setup({{0, 1, 0, 5, 0, 0, "nan.xol0"}}), testing::ExitedWithCode(1),
                "XOL data holds a value that is not a finite number: .*nan.xol0, item 1 \"Item "
                "1\", step 3\n");
    EXPECT_EXIT(Setup({{0, 1, 0, 5, 1, 1, "late.xol1"}}), testing::ExitedWithCode(1),
                "XOL data holds a value that is not a finite number: .*late.xol1, item 1 \"Item "
                "1\", step 4, point 2\n");
    Setup({{0, 1, 0, 5, 1, 1, "after.xol1"}});
    Steps(1, 20);
    EXPECT_FLOAT_EQ(BoundaryValues(1).Value(2, 1), 1.0f);
}

}  // namespace
