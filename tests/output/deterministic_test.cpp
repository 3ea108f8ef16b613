// Deterministic output as a user gets it: the engine run on a model file that
// asks for points, lines and areas, and the files read back: their shape,
// names, time axes and flags, and values that agree with each other and with
// the rules of every item.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

#include "data/xolfile.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;
constexpr float kDelete = -1.0e-30f;

// An Output_Spec_Data_% section; count gives Number_Of_Items when not 0,
// else the items are counted.
std::string Record(int n, const std::string& file, const std::string& x, const std::string& y,
                   const std::string& items, int first, int last, int interval,
                   const std::string& extra = "", int count = 0) {
    if (count == 0) count = 1 + static_cast<int>(std::count(items.begin(), items.end(), ','));
    std::ostringstream s;
    s << "Output_Spec_Data_" << n << " {\nFile_Name = file(\"" << file << "\")\n"
      << "X_Range_And_Interval = " << x << "\nY_Range_And_Interval = " << y
      << "\nFirst_Time_step = " << first << "\nLast_Time_step = " << last
      << "\nTime_Step_Interval = " << interval << "\nNumber_Of_Items = " << count
      << "\nItem_Numbers = " << items << "\nTitle = \"Record " << n << "\"\n"
      << extra << "}\n";
    return s.str();
}

class Deterministic : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    std::vector<float> bed;
    void SetUp() override {
        // 11 x 9 points of 1 m by 2 m; land all round, water 1 m deep, 0.5 m
        // from j = 7 on. The surface starts tilted both ways, so that both
        // fluxes move.
        grid.J = 10, grid.K = 8, grid.dx = 1.0f, grid.dy = 2.0f;
        bed = bwtest::Constant(grid, -1.0f);
        std::vector<float> xi(bed.size());
        for (int k = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j) {
                float& b = bed[At(j, k)];
                if (j == 0 || k == 0 || j == grid.J || k == grid.K)
                    b = 1.0f;
                else if (j >= 7)
                    b = -0.5f;
                xi[At(j, k)] =
                    0.02f * std::cos(3.14159f * j / 10) + 0.01f * std::cos(3.14159f * k / 8);
            }
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        bwtest::MapSpec surface = grid;
        surface.itemName = "Surface";
        bwtest::WriteMapFile(dir / "xi.xol2", surface, xi);
    }
    size_t At(int j, int k) const { return static_cast<size_t>(k) * (grid.J + 1) + j; }
    bool Land(int j, int k) const { return bed[At(j, k)] >= 0.0f; }
    bwtest::RunResult Run(const Sections& sections) {
        Sections all = sections;
        all["SURFACE_ELEVATION"] = "SURFACE_TYPE = 1\n" + bwtest::DataFileSection("xi.xol2");
        bwtest::WriteFile(dir / "m.bw", bwtest::ModelText("bed.xol2", all));
        return bwtest::RunProgram({bwtest::BuiltProgram("bw"), "m.bw"}, dir.path.string(),
                                  {{"TARN_PROGRESS", "NONE"}}, {"BUILDMODE", "TRF"});
    }
};

TEST_F(Deterministic, PointsLinesAndAreasHoldTheirItemsOnTheirSubGrids) {
    std::string records = "Number_Of_Records = 5\n";
    records +=
        Record(1, "coarse.xol2", "1, 9, 2", "0, 8, 2", "1, 2, 9", 0, 6, 2, "Type_Of_Land = 1\n");
    records += Record(2, "full.xol2", "0, 10, 1", "0, 8, 1", "3, 4, 11, 12, 2", 1, 5, 1);
    records +=
        Record(3, "gauges.xol0", "2, 5, 8", "3, 4, 5", "1, 2", 1, 5, 1, "NO_OF_POINTS = 3\n");
    records += Record(4, "one.xol1", "4, 4, 1", "4, 4, 1", "2, 3, 4", 1, 5, 1);
    records += Record(5, "cut.xol1", "0, 10, 1", "4, 4, 1", "2", 1, 5, 1);
    const bwtest::RunResult r = Run({{"Output_Deterministic_2D", records}});
    ASSERT_EQ(r.exitCode, 0) << r.out;

    // The shape of each file: an area with intervals, starting at step 0 with
    // two steps a record; a full area from step 1 (0.1 s after the start);
    // three points of two items; one point in a line file, of dimension 0; a
    // line along x. Depth, P and Q are hot transfer data (type 1), a depth
    // alone is flagged -1. An area carries the bathymetry as a static item.
    const std::pair<const char*, const char*> shapes[] = {
        {"coarse.xol2",
         "2D, 3+1 items, 4 x 0.2 s from +0, type 0, NON-UTM, 5 x 2 from 1, 5 x 4 from 0"},
        {"full.xol2",
         "2D, 5+1 items, 5 x 0.1 s from +0.1, type 0, NON-UTM, 11 x 1 from 0, 9 x 2 from 0"},
        {"gauges.xol0", "0D, 6+0 items, 5 x 0.1 s from +0.1, type 0, "},
        {"one.xol1", "0D, 3+0 items, 5 x 0.1 s from +0.1, type 1, "},
        {"cut.xol1", "1D, 1+0 items, 5 x 0.1 s from +0.1, type -1, , 11 x 1 from 0"},
    };
    // Every record of every item of a file: values[file][record][item][point].
    std::map<std::string, std::vector<std::vector<std::vector<float>>>> values;
    std::map<std::string, std::vector<float>> bathymetry;
    std::string gaugeName;
    for (const auto& [name, shape] : shapes) {
        XolFile f = XolOpenRead(dir / name);
        EXPECT_EQ(f.startDateTime, "2004-01-01 00:00:00") << name;
        std::ostringstream s;
        s << f.dimension << "D, " << f.noDynamicItems << "+" << f.noStaticItems << " items, "
          << f.noTimeSteps << " x " << f.timeStep << " s from +" << f.startOffset << ", type "
          << f.dataType << ", " << f.projection;
        size_t points = 1;
        for (int a = 0; a < f.dimension; ++a) {
            s << ", " << f.axes[a].count << " x " << f.axes[a].spacing << " from "
              << f.axes[a].origin;
            points *= static_cast<size_t>(f.axes[a].count);
        }
        EXPECT_EQ(s.str(), shape);
        if (f.dimension == 0 && f.noDynamicItems > 4) gaugeName = f.dynamicItems[4].name;
        if (f.noStaticItems == 1) {
            bathymetry[name].resize(points);
            XolReadStatic(f, bathymetry[name].data());
        }
        auto& v = values[name];
        v.resize(static_cast<size_t>(std::max(f.noTimeSteps, 0)));
        for (auto& record : v) {
            record.assign(static_cast<size_t>(f.noDynamicItems), std::vector<float>(points));
            for (auto& item : record) XolReadDynamic(f, item.data());
        }
        XolClose(f);
    }
    ASSERT_FALSE(HasFailure());

    // The coarse area's bathymetry and its still water depth are the bed,
    // land deleted (Type_Of_Land 1), the latter in every record from the cold
    // start on; the full area's bathymetry keeps the land's level.
    for (int p = 0; p < 25; ++p) {
        const int j = 1 + 2 * (p % 5), k = 2 * (p / 5);
        const float expected = Land(j, k) ? kDelete : bed[At(j, k)];
        EXPECT_FLOAT_EQ(bathymetry["coarse.xol2"][p], expected) << j << "," << k;
        for (const auto& record : values["coarse.xol2"]) EXPECT_FLOAT_EQ(record[2][p], expected);
    }
    EXPECT_FLOAT_EQ(bathymetry["full.xol2"][0], 1.0f);
    EXPECT_FLOAT_EQ(values["coarse.xol2"][0][0][0], kDelete);  // a dry surface at (1,0)

    // Velocities of the full area: u from the fluxes on the faces west and
    // east of a point, v from the faces south and north at the two latest
    // time levels, each over the depth.
    const auto& f = values["full.xol2"];
    double largestU = 0.0, largestV = 0.0;
    for (size_t n = 1; n < f.size(); ++n)
        for (int k = 1; k < grid.K; ++k)
            for (int j = 1; j < grid.J; ++j) {
                const size_t p = At(j, k), w = At(j - 1, k), s = At(j, k - 1);
                const auto &P = f[n][0], &Q = f[n][1], &Qold = f[n - 1][1];
                const double u = 0.5 * (P[p] + P[w]) / f[n][4][p];
                const double v = 0.25 * (Q[p] + Q[s] + Qold[p] + Qold[s]) / f[n][4][p];
                EXPECT_NEAR(f[n][2][p], u, 1e-3 * std::fabs(u) + 1e-7) << j << "," << k;
                EXPECT_NEAR(f[n][3][p], v, 1e-3 * std::fabs(v) + 1e-7) << j << "," << k;
                largestU = std::max(largestU, std::fabs(u));
                largestV = std::max(largestV, std::fabs(v));
            }
    EXPECT_GT(largestU, 1e-3);  // the surface moves: the check above has weight
    EXPECT_GT(largestV, 1e-4);
    EXPECT_FLOAT_EQ(f[0][2][0], kDelete);  // no velocity on land

    // Items of several points are named by their point, in point order, and
    // hold the values of the grid at that point.
    EXPECT_EQ(gaugeName, "P(8,5): Surface elevation");
    EXPECT_FLOAT_EQ(values["gauges.xol0"][3][3][0], f[3][4][At(5, 4)]);  // depth at (5,4)
}

TEST_F(Deterministic, WrongRecordsStopWithTheirMessages) {
    // A line or area needs ranges inside the grid; a point file names its
    // points one by one; a record needs a step, an item and a point.
    auto one = [](const std::string& file, const std::string& x, const std::string& items,
                  const std::string& extra = "", int interval = 1, int count = 0) {
        return "Number_Of_Records = 1\n" +
               Record(1, file, x, "2, 3, 1", items, 0, 5, interval, extra, count);
    };
    const std::string det = "Output_Deterministic_2D", stat = "Output_Statistic_2D";
    const std::string two = "NO_OF_POINTS = 2\n";
    const struct {
        std::string section, body, message;
    } cases[] = {
        {det, one("out.XOL2", "0, 10, 1", "1"), "SetupOutputDeterministic2D: Wrong file extension"},
        {det, one("out.xol2", "0, 10, 1", "1, 13"), "WriteOutputStatistic: Wrong type of item"},
        {det, one("out.xol1", "0, 11, 1", "1"),
         "SetupOutputDeterministic2D: X_Range_And_Interval of record 1 must run from first to "
         "last within 0..10 with an interval of at least 1"},
        {det, one("p.xol0", "1, 11", "1", two),
         "SetupOutputDeterministic2D: point 2 of record 1 lies outside the grid"},
        {det, one("p.xol0", "1", "1", "NO_OF_POINTS = 0\n"),
         "SetupOutputDeterministic2D: NO_OF_POINTS of record 1 must be at least 1"},
        {det, one("p.xol0", "1, 2", "1", two, 0),
         "SetupOutputDeterministic2D: Time_Step_Interval of record 1 must be at least 1"},
        {det, one("p.xol0", "1, 2", "1", two, 1, -1),
         "SetupOutputDeterministic2D: Number_Of_Items of record 1 must be at least 1"},
        {stat, "Type = 1\nTime_Step_Interval = 0\nNumber_Of_Records = 0\n",
         "Output_Statistic_2D: Time_Step_Interval must be at least 1"},
    };
    for (const auto& c : cases) {
        const bwtest::RunResult r = Run({{c.section, c.body}});
        EXPECT_EQ(r.exitCode, 1) << c.message;
        EXPECT_EQ(r.out, c.message + "\n");
    }
}

}  // namespace
