// Open boundaries: which side of the water a line closes, the series with its
// warm-up ramp, the interpolation of series files, the tables the sweeps read
// for every formulation and kind of data, and the files that are refused.
#include "processes/open_boundaries.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
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
        g.dt = 0.1;
        g.timeStepCount = 20;
        g.lastStep = 19;
        g.warmUpPeriod = 0;
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
    // Steps from..to as the time loop makes them.
    void Steps(int from, int to) {
        for (int s = from; s <= to; ++s) {
            TsReadStep(s);
            UpdateBoundaryData(s);
        }
    }
};

using BoundariesDeathTest = Boundaries;

TEST_F(Boundaries, ALevelSeriesIsRampedFromTheSurfaceAtTheLineMiddle) {
    GridState& g = gGrid;
    g.timeStepCount = 40, g.warmUpPeriod = 20;
    TsReset();
    TsInit(g.timeStepCount + 1);
    std::vector<float> ones(41, 1.0f), twos(41, 2.0f);
    bwtest::WriteSeriesFile(dir / "one.xol0", kStart, 0.1, {ones, twos});
    std::fill(g.xi.begin(), g.xi.end(), 0.2f);
    g.xi[g.At(0, 3)] = 0.4f;  // the middle of the line (0,1)..(0,5)
    gEquation.deepWaterTerms = true;
    Line level{0, 1, 0, 5};
    level.file = "one.xol0";
    level.items = 2;
    Setup({level});
    const BoundaryRecord& r = Boundary(1);
    // The store is read one step after the other, as the time loop does.
    std::vector<float> main(31), deep(31);
    for (int n = 1; n <= 30; ++n) {
        TsReadStep(n);
        main[n] = TsValue(r.seriesId), deep[n] = TsValue(r.deepSeriesId);
    }
    EXPECT_NEAR(main[1], 0.4f + 0.6f * (1.0f + std::sin(-0.9f * 1.570796f)) / 2.0f, 1e-6f);
    EXPECT_NEAR(main[10], 0.7f, 1e-6f);  // midway between 0.4 and 1
    EXPECT_NEAR(deep[10], 1.0f, 1e-6f);  // the deep series from 0
    EXPECT_NEAR(main[20], 1.0f, 1e-6f);
    EXPECT_FLOAT_EQ(main[30], 1.0f);
    EXPECT_FLOAT_EQ(deep[30], 2.0f);
}

TEST_F(Boundaries, SeriesFilesAreInterpolatedByTheirMethod) {
    // A quadratic is what the cubic reproduces exactly, ends included; the
    // file's step is five model steps and starts a second before the run.
    auto f = [](double t) { return 1.0 + 0.5 * t - 0.2 * t * t; };
    std::vector<float> quad, angle;
    for (int n = 0; n <= 7; ++n) {
        quad.push_back(static_cast<float>(f(-1.0 + 0.5 * n)));
        angle.push_back(n % 2 == 0 ? 350.0f : 10.0f);
    }
    bwtest::WriteSeriesFile(dir / "q.xol0", "2003-12-31 23:59:59", 0.5, {quad, quad, angle});
    const int32_t items[3] = {1, 2, 3}, methods[3] = {2, 1, 3};
    std::vector<float> s;
    ReadTimeSeries0D(dir / "q.xol0", 3, items, methods, s);
    ASSERT_EQ(s.size(), 21u * 3);
    for (int n = 0; n <= 20; ++n) {
        const double t = n * 0.1;
        EXPECT_NEAR(s[n * 3], f(t), 2e-6) << n;
        // Linear: exact at the records, the chord between them.
        const double t0 = std::floor(t / 0.5 + 1e-9) * 0.5, w = (t - t0) / 0.5;
        EXPECT_NEAR(s[n * 3 + 1], f(t0) * (1 - w) + f(t0 + 0.5) * w, 2e-6) << n;
    }
    // A direction goes the short way round north: 350 to 10 passes 360.
    EXPECT_NEAR(s[2 * 3 + 2], 350.0f + 20.0f * 0.4f, 1e-3f);
    EXPECT_NEAR(s[5 * 3 + 2], 10.0f, 1e-3f);
}

TEST_F(Boundaries, EveryKindOfLineFindsItsSideAndFillsItsTable) {
    // Line files: records every 0.5 s from the start; record n holds 10 n + s
    // at point s, the P item 100 more and the Q item 200 more.
    auto records = [](int points, float add) {
        std::vector<std::vector<float>> r(6, std::vector<float>(points));
        for (int n = 0; n < 6; ++n)
            for (int s = 0; s < points; ++s) r[n][s] = 10.0f * n + s + add;
        return r;
    };
    bwtest::WriteLineFile(dir / "flux.xol1", kStart, 0.5, 2.0f, {records(5, 0.0f)});
    bwtest::WriteLineFile(dir / "hot.xol1", kStart, 0.5, 1.0f,
                          {records(7, 0.0f), records(7, 100.0f), records(7, 200.0f)}, 1);
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
    // south), ends sorted, and a row of the table for each point.
    const int sides[7] = {1, 3, 1, 4, 2, 3, 2}, rows[7] = {5, 5, 5, 7, 7, 1, 1};
    for (int b = 1; b <= 7; ++b) {
        EXPECT_EQ(Boundary(b).orientation, sides[b - 1]) << b;
        EXPECT_EQ(BoundaryValues(b).rows, rows[b - 1]) << b;
    }
    EXPECT_EQ(Boundary(1).first[1], 1);
    EXPECT_EQ(Boundary(1).last[1], 5);
    EXPECT_EQ(Boundary(4).first[0], 1);
    // Step 1 at t = 0.1 s: series item 1 is 0.1, item 2 is 1; step 7 at
    // t = 0.7 s lies 0.4 of the way from record 1 to record 2 of a line file.
    const struct {
        int step, boundary, row, column;
        float value, tolerance;
    } cases[] = {
        {1, 1, 2, 1, 0.1f, 1e-6f},
        {1, 1, 2, 2, (0.2f + 0.1f) / 2, 1e-6f},  // the mean of the surface and the level
        {1, 1, 2, 3, 0.0f, 0.0f},
        {1, 1, 2, 5, 1.0f, 1e-5f},  // the deep-water value
        {1, 1, 2, 6, 1.0f, 1e-5f},  // step 1: no earlier value, the same one
        {1, 2, 0, 2, 1.0f, 0.0f},
        {1, 2, 4, 1, 0.1f, 1e-6f},
        {2, 1, 0, 5, 2.0f, 1e-5f},
        {2, 1, 0, 6, 1.5f, 1e-5f},  // half a step earlier
        {7, 3, 3, 1, 14.0f + 3.0f, 1e-4f},
        {7, 3, 3, 2, 1.0f, 0.0f},
        {7, 4, 6, 1, 20.0f, 1e-4f},         // water depth
        {7, 4, 6, 2, 0.1f + 20.0f, 1e-4f},  // half the surface and the depth
        {7, 4, 6, 3, 220.0f, 1e-4f},        // Q
        {7, 4, 6, 4, 120.0f, 1e-4f},        // P
        {7, 5, 0, 1, 114.0f, 1e-4f},
        {7, 5, 0, 2, 114.0f, 1e-4f},
        {7, 5, 0, 4, 114.0f, 1e-4f},
        {7, 3, 0, 5, 0.0f, 0.0f},     // a line file carries no deep-water value
        {20, 3, 0, 1, 40.0f, 1e-4f},  // t = 2 s, record 4
    };
    int done = 0;
    for (const auto& c : cases) {
        if (c.step > done) Steps(done + 1, c.step), done = c.step;
        EXPECT_NEAR(BoundaryValues(c.boundary).Value(c.row, c.column), c.value, c.tolerance)
            << "step " << c.step << " boundary " << c.boundary << " (" << c.row << "," << c.column
            << ")";
    }
}

TEST_F(BoundariesDeathTest, LinesSettingsAndFilesThatDoNotFitStop) {
    auto write = [&](const std::string& name, int items, int points, float spacing,
                     int records = 6) {
        std::vector<std::vector<std::vector<float>>> v(
            items, std::vector<std::vector<float>>(records, std::vector<float>(points, 0.0f)));
        bwtest::WriteLineFile(dir / name, kStart, 0.5, spacing, v);
    };
    write("two.xol1", 2, 5, 2.0f);
    write("cold.xol1", 3, 5, 2.0f);
    write("dx.xol1", 1, 7, 2.0f);
    write("dy.xol1", 1, 5, 1.0f);
    write("count.xol1", 1, 4, 2.0f);
    write("short.xol1", 1, 5, 2.0f, 4);
    // Series for the 20 steps of 0.1 s, which need records from 0 to 2 s.
    bwtest::WriteSeriesFile(dir / "exact.xol0", kStart, 0.5, {std::vector<float>(5, 1.0f)});
    bwtest::WriteSeriesFile(dir / "short.xol0", kStart, 0.5, {std::vector<float>(4, 1.0f)});
    bwtest::WriteSeriesFile(dir / "late.xol0", "2004-01-01 00:00:01", 0.5,
                            {std::vector<float>(9, 1.0f)});
    // A series on a relative time axis has no date to meet the run's start.
    XolFile relative = XolCreateHeader("Relative", 1, 0);
    XolSetItem(relative, 1, 100078, "Level", 1000);
    xolSetEqTimeAxis(relative.header, 1400, 0.0, 0.5, 0);
    XolCreateFile(relative, dir / "relative.xol0");
    for (float v : {0.0f, 1.0f, 2.0f, 3.0f, 4.0f, 5.0f}) XolWriteDynamic(relative, &v);
    XolClose(relative);
    // deep: with the deep water terms; convective: with another handling of
    // the convective terms.
    const struct {
        Line line;
        const char* message;
        bool deep = false, convective = false;
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
         false,
         true},
        {{0, 1, 0, 5},
         "SetupOpenBoundaries: the deep water terms need two items in the series",
         true},
        {{0, 1, 0, 5, 0, 0, "short.xol0"}, "XOL data does not cover the simulation period"},
        {{0, 1, 0, 5, 0, 0, "late.xol0"}, "XOL data does not cover the simulation period"},
        {{0, 1, 0, 5, 0, 0, "exact.xol0", 2},
         "XOL data does not contain the correct number of items"},
        {{0, 1, 0, 5, 0, 0, "two.xol1"}, "XOL data is not 0D"},
        {{0, 1, 0, 5, 0, 0, "relative.xol0"}, "XOL data does not contain a calendar time axis"},
        {{0, 1, 0, 5, 1, 1, "level.xol0"}, "XOL data is not 1D"},
        {{0, 1, 0, 5, 1, 1, "two.xol1"}, "XOL data does not contain the correct number of items"},
        {{0, 1, 0, 5, 1, 2, "cold.xol1"}, "XOL data is not hot transfer data"},
        {{1, 0, 7, 0, 1, 1, "dx.xol1"},
         "XOL data does not have the correct grid spacing \\(x-dir.\\)"},
        {{0, 1, 0, 5, 1, 1, "dy.xol1"},
         "XOL data does not have the correct grid spacing \\(y-dir.\\)"},
        {{0, 1, 0, 5, 1, 1, "count.xol1"},
         "XOL data does not have the correct number of grid points \\(x.dir.\\)"},
        {{0, 1, 0, 5, 1, 1, "short.xol1"}, "XOL data does not cover the simulation period"},
    };
    for (const auto& c : cases)
        EXPECT_EXIT(
            {
                gEquation.deepWaterTerms = c.deep;
                gEquation.convectiveHandle = c.convective ? 1 : 0;
                Setup({c.line});
            },
            testing::ExitedWithCode(1), c.message)
            << c.message << " " << c.line.file;
    // A series that ends at the run's end will do, and the last step reads it.
    Setup({{0, 1, 0, 5, 0, 0, "exact.xol0"}});
    Steps(1, 20);
    EXPECT_FLOAT_EQ(BoundaryValues(1).Value(0, 1), 1.0f);
}

}  // namespace
