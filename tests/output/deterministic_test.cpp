// Deterministic output as a user gets it: the engine run on a model file that
// asks for points, lines and areas, and the files read back: their shape,
// names, time axes and flags, and values that agree with each other and with
// the rules of every item.
#include <gtest/gtest.h>

#include <cmath>

#include "data/xolfile.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;
constexpr float kDelete = -1.0e-30f;

// An Output_Spec_Data_% section.
std::string Spec(int n, const std::string& file, const std::string& x, const std::string& y,
                 const std::string& items, int first, int last, int interval,
                 const std::string& extra = "") {
    int count = 1;
    for (char c : items) count += c == ',';
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
                xi[At(j, k)] = 0.02f * std::cos(3.14159f * j / 10) + 0.01f * std::cos(3.14159f * k / 8);
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
    void ExpectStop(const Sections& sections, const std::string& message) {
        const bwtest::RunResult r = Run(sections);
        EXPECT_EQ(r.exitCode, 1) << message;
        EXPECT_EQ(r.out, message + "\n");
    }
    // Every record of every item of a file: values[record][item][point].
    static std::vector<std::vector<std::vector<float>>> ReadAll(XolFile& f, size_t points) {
        std::vector<std::vector<std::vector<float>>> v(static_cast<size_t>(f.noTimeSteps));
        for (auto& record : v) {
            record.assign(static_cast<size_t>(f.noDynamicItems), std::vector<float>(points));
            for (auto& item : record) XolReadDynamic(f, item.data());
        }
        return v;
    }
};

TEST_F(Deterministic, PointsLinesAndAreasHoldTheirItemsOnTheirSubGrids) {
    std::string records = "Number_Of_Records = 6\n";
    records += Spec(1, "coarse.xol2", "1, 9, 2", "0, 8, 2", "1, 2, 9", 0, 6, 2, "Type_Of_Land = 1\n");
    records += Spec(2, "full.xol2", "0, 10, 1", "0, 8, 1", "3, 4, 11, 12, 2", 1, 5, 1);
    records += Spec(3, "gauges.xol0", "2, 5, 8", "3, 4, 5", "1, 2", 1, 5, 1, "NO_OF_POINTS = 3\n");
    records += Spec(4, "ycut.xol1", "5, 5, 1", "0, 8, 1", "9", 1, 5, 1);
    records += Spec(5, "one.xol1", "4, 4, 1", "4, 4, 1", "2, 3, 4", 1, 5, 1);
    records += Spec(6, "xcut.xol1", "0, 10, 1", "4, 4, 1", "2", 1, 5, 1);
    const bwtest::RunResult r = Run({{"Output_Deterministic_2D", records}});
    ASSERT_EQ(r.exitCode, 0) << r.out;

    // An area with intervals: its axes, a time axis from step 0 at two steps
    // a record, the bathymetry with land deleted, the state before step 1 first.
    XolFile coarse = XolOpenRead(dir / "coarse.xol2");
    EXPECT_EQ(coarse.dimension, 2);
    EXPECT_EQ(coarse.axes[0].count, 5);
    EXPECT_FLOAT_EQ(coarse.axes[0].spacing, 2.0f);
    EXPECT_FLOAT_EQ(coarse.axes[0].origin, 1.0f);
    EXPECT_EQ(coarse.axes[1].count, 5);
    EXPECT_FLOAT_EQ(coarse.axes[1].spacing, 4.0f);
    EXPECT_EQ(coarse.noTimeSteps, 4);
    EXPECT_EQ(coarse.startDateTime, "2004-01-01 00:00:00");
    EXPECT_NEAR(coarse.timeStep, 0.2, 1e-9);
    EXPECT_EQ(coarse.startOffset, 0.0);
    EXPECT_EQ(coarse.dataType, 0);
    EXPECT_EQ(coarse.projection, "NON-UTM");
    ASSERT_EQ(coarse.noStaticItems, 1);
    std::vector<float> b(25);
    XolReadStatic(coarse, b.data());
    EXPECT_FLOAT_EQ(b[0], kDelete);           // (1,0) is land
    EXPECT_FLOAT_EQ(b[1 * 5 + 4], -0.5f);     // (9,2)
    EXPECT_FLOAT_EQ(b[2 * 5 + 1], -1.0f);     // (3,4)
    const auto c = ReadAll(coarse, 25);
    XolClose(coarse);
    const float xi0 = 0.02f * std::cos(3.14159f * 3 / 10) + 0.01f * std::cos(3.14159f * 4 / 8);
    EXPECT_FLOAT_EQ(c[0][0][2 * 5 + 1], xi0);  // record 1 is the cold start itself
    EXPECT_FLOAT_EQ(c[0][0][0], kDelete);      // dry: the land of the frame
    for (const auto& record : c)
        for (int p = 0; p < 25; ++p) {
            const int j = 1 + 2 * (p % 5), k = 2 * (p / 5);
            if (Land(j, k)) continue;
            EXPECT_NEAR(record[1][p], record[0][p] - bed[At(j, k)], 1e-6f);  // water depth
            EXPECT_GT(record[1][p], 0.0f);
            EXPECT_FLOAT_EQ(record[2][p], bed[At(j, k)]);  // still water depth, negative
        }

    // The full area: land keeps its level in the bathymetry; velocities from
    // the fluxes on their faces and the depth.
    XolFile full = XolOpenRead(dir / "full.xol2");
    EXPECT_EQ(full.noTimeSteps, 5);
    EXPECT_EQ(full.startDateTime, "2004-01-01 00:00:00");  // First_Time_step 1 at 0.1 s
    EXPECT_NEAR(full.startOffset, 0.1, 1e-9);
    b.resize(99);
    XolReadStatic(full, b.data());
    EXPECT_FLOAT_EQ(b[0], 1.0f);
    const auto f = ReadAll(full, 99);
    XolClose(full);
    double largestU = 0.0, largestV = 0.0;
    for (size_t n = 1; n < f.size(); ++n)
        for (int k = 1; k < grid.K; ++k)
            for (int j = 1; j < grid.J; ++j) {
                const size_t p = At(j, k), w = At(j - 1, k), s = At(j, k - 1);
                const auto& P = f[n][0];
                const auto& Q = f[n][1];
                const auto& Qold = f[n - 1][1];
                const float depth = f[n][4][p];
                const double u = 0.5 * (P[p] + P[w]) / depth;
                const double v = 0.25 * (Q[p] + Q[s] + Qold[p] + Qold[s]) / depth;
                EXPECT_NEAR(f[n][2][p], u, 1e-3 * std::fabs(u) + 1e-7) << j << "," << k;
                EXPECT_NEAR(f[n][3][p], v, 1e-3 * std::fabs(v) + 1e-7) << j << "," << k;
                largestU = std::max(largestU, std::fabs(u));
                largestV = std::max(largestV, std::fabs(v));
            }
    EXPECT_GT(largestU, 1e-3);  // the surface moves: the check above has weight
    EXPECT_GT(largestV, 1e-4);
    EXPECT_FLOAT_EQ(f[0][2][0], kDelete);  // no velocity on land

    // Three points of two items: six items named by their point, in point order.
    XolFile gauges = XolOpenRead(dir / "gauges.xol0");
    EXPECT_EQ(gauges.dimension, 0);
    EXPECT_EQ(gauges.noStaticItems, 0);
    ASSERT_EQ(gauges.noDynamicItems, 6);
    EXPECT_EQ(gauges.dynamicItems[0].name, "P(2,3): Surface elevation");
    EXPECT_EQ(gauges.dynamicItems[1].name, "P(2,3): Water depth");
    EXPECT_EQ(gauges.dynamicItems[4].name, "P(8,5): Surface elevation");
    const auto g = ReadAll(gauges, 1);
    XolClose(gauges);
    EXPECT_FLOAT_EQ(g[3][3][0], f[3][4][At(5, 4)]);  // the depth of the full area at (5,4)

    // A line along y has its one axis in y; still water depth is negative in
    // water and deleted on land.
    XolFile ycut = XolOpenRead(dir / "ycut.xol1");
    EXPECT_EQ(ycut.dimension, 1);
    EXPECT_EQ(ycut.axes[0].count, 9);
    EXPECT_FLOAT_EQ(ycut.axes[0].spacing, 2.0f);
    const auto y = ReadAll(ycut, 9);
    XolClose(ycut);
    EXPECT_FLOAT_EQ(y[0][0][0], kDelete);
    EXPECT_FLOAT_EQ(y[0][0][4], -1.0f);

    // One point in a line file is a file of dimension 0; depth, P and Q are
    // hot transfer data, a depth alone is flagged -1.
    XolFile one = XolOpenRead(dir / "one.xol1");
    EXPECT_EQ(one.dimension, 0);
    EXPECT_EQ(one.dataType, 1);
    XolClose(one);
    XolFile xcut = XolOpenRead(dir / "xcut.xol1");
    EXPECT_EQ(xcut.dimension, 1);
    EXPECT_EQ(xcut.axes[0].count, 11);
    EXPECT_EQ(xcut.dataType, -1);
    XolClose(xcut);

    // Each file's summary reaches the log when it is closed.
    const std::string log = bwtest::ReadFile(dir / "m.log");
    EXPECT_NE(log.find("Title  : Record 6"), std::string::npos);
}

TEST_F(Deterministic, WrongRecordsAndOutputsOfLaterVersionsStop) {
    auto one = [](const std::string& file, const std::string& items) {
        return "Number_Of_Records = 1\n" + Spec(1, file, "0, 10, 1", "0, 8, 1", items, 1, 5, 1);
    };
    ExpectStop({{"Output_Deterministic_2D", one("out.nc", "1")}},
               "SetupOutputDeterministic2D: Wrong file extension");
    ExpectStop({{"Output_Deterministic_2D", one("out.XOL2", "1")}},
               "SetupOutputDeterministic2D: Wrong file extension");
    ExpectStop({{"Output_Deterministic_2D", one("out.xol2", "1, 13")}},
               "WriteOutputStatistic: Wrong type of item");
    ExpectStop({{"Output_Deterministic_2D",
                 "Number_Of_Records = 1\n" + Spec(1, "out.xol1", "0, 11, 1", "4, 4, 1", "1", 1, 5, 1)}},
               "SetupOutputDeterministic2D: X_Range_And_Interval of record 1 must run from first to "
               "last within 0..10 with an interval of at least 1");
    // A point file names its points one by one; a record needs a step, an item and a point.
    auto points = [](const std::string& count, const std::string& x, const std::string& interval,
                     const std::string& items) {
        return "Number_Of_Records = 1\nOutput_Spec_Data_1 {\nFile_Name = file(\"p.xol0\")\n"
               "NO_OF_POINTS = " + count + "\nX_Range_And_Interval = " + x +
               "\nY_Range_And_Interval = 2, 3\nFirst_Time_step = 0\nLast_Time_step = 5\n"
               "Time_Step_Interval = " + interval + "\nNumber_Of_Items = " + items +
               "\nItem_Numbers = 1\nTitle = \"P\"\n}\n";
    };
    ExpectStop({{"Output_Deterministic_2D", points("2", "1, 11", "1", "1")}},
               "SetupOutputDeterministic2D: point 2 of record 1 lies outside the grid");
    ExpectStop({{"Output_Deterministic_2D", points("0", "1", "1", "1")}},
               "SetupOutputDeterministic2D: NO_OF_POINTS of record 1 must be at least 1");
    ExpectStop({{"Output_Deterministic_2D", points("2", "1, 2", "0", "1")}},
               "SetupOutputDeterministic2D: Time_Step_Interval of record 1 must be at least 1");
    ExpectStop({{"Output_Deterministic_2D", points("2", "1, 2", "1", "0")}},
               "SetupOutputDeterministic2D: Number_Of_Items of record 1 must be at least 1");
    ExpectStop({{"Output_Statistic_2D", "Type = 1\nTime_Step_Interval = 0\nNumber_Of_Records = 0\n"}},
               "Output_Statistic_2D: Time_Step_Interval must be at least 1");
    ExpectStop({{"Output_Statistic_2D", "Type = 1\nTime_Step_Interval = 10\nNumber_Of_Records = 0\n"}},
               "Wave statistics output is not yet available in this version");
    ExpectStop({{"Output_Disturbance_2D", "Type = 1\nTime_Step_Interval = 10\n"}},
               "Wave disturbance output is not yet available in this version");
    ExpectStop({{"Output_Hotstart_2D", "Hot_Start = true\n"}},
               "Hot-start output is not yet available in this version");
}

}  // namespace
