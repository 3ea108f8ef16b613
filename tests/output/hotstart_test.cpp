// Hot-start output as a user gets it: the state file of a run read back, the
// former file kept whole when a write fails, files that are not state files
// refused, and a run split in two that goes on from the file as the unbroken
// run does.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <sstream>

#include "data/xolfile.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

using Sections = std::map<std::string, std::string>;
using Records = std::vector<std::vector<std::vector<float>>>;  // [record][item][point]
constexpr float kDelete = -1.0e-30f;
constexpr const char* kAbnormal = "\nAbnormal completion\n";

// Every record of every dynamic item of a map file.
Records ReadRecords(const std::string& path) {
    XolFile f = XolOpenRead(path);
    size_t points = 1;
    for (int a = 0; a < f.dimension; ++a) points *= static_cast<size_t>(f.axes[a].count);
    std::vector<float> skip(points);
    for (int s = 0; s < f.noStaticItems; ++s) XolReadStatic(f, skip.data());
    Records records(static_cast<size_t>(f.noTimeSteps));
    for (auto& record : records) {
        record.assign(static_cast<size_t>(f.noDynamicItems), std::vector<float>(points));
        for (auto& item : record) XolReadDynamic(f, item.data());
    }
    XolClose(f);
    return records;
}

std::string HotstartSection(const std::string& file, const std::string& span) {
    return "Hot_Start = true\nTitle = \"State\"\nFile_Name = file(\"" + file + "\")\n" + span;
}
std::string Span(int first, int last) {
    return "First_Time_Step = " + std::to_string(first) +
           "\nLast_Time_Step = " + std::to_string(last) + "\n";
}

// Area records of the whole grid to `file`, items surface, P, Q and roller
// thickness, every step.
std::string AreaOutput(int J, int K, const std::string& file = "area.xol2") {
    std::ostringstream s;
    s << "Number_Of_Records = 1\nOutput_Spec_Data_1 {\nFile_Name = file(\"" << file << "\")\n"
      << "X_Range_And_Interval = 0, " << J << ", 1\nY_Range_And_Interval = 0, " << K << ", 1\n"
      << "First_Time_step = 1\nLast_Time_step = 100000\nTime_Step_Interval = 1\n"
      << "Number_Of_Items = 4\nItem_Numbers = 1, 3, 4, 5\nTitle = \"Area\"\n}\n";
    return s.str();
}

class Hotstart : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    std::vector<float> bed;

    size_t At(int j, int k) const { return static_cast<size_t>(k) * (grid.J + 1) + j; }
    // Writes the model as name.bw and runs it on one thread (two spin at each
    // barrier when the machine is busy), under the launcher if one is given.
    bwtest::RunResult Run(const std::string& name, const std::string& bathymetry,
                          const Sections& sections, const std::string& launcher = "") {
        bwtest::WriteFile(dir / (name + ".bw"), bwtest::ModelText(bathymetry, sections));
        std::vector<std::string> argv = {bwtest::BuiltProgram("bw"), name + ".bw"};
        if (!launcher.empty())
            argv = {"/bin/sh", "-c", launcher + " exec '" + argv[0] + "' " + name + ".bw"};
        return bwtest::RunProgram(argv, dir.path.string(),
                                  {{"TARN_PROGRESS", "NONE"}, {"OMP_NUM_THREADS", "1"}},
                                  {"BUILDMODE", "TRF"});
    }
    bool EndsAbnormally() { return bwtest::ReadFile(dir / "m.log").ends_with(kAbnormal); }
};

// A closed basin of 11 x 9 points whose surface starts tilted both ways.
class HotstartBasin : public Hotstart {
protected:
    std::vector<float> xi0;
    void SetUp() override {
        grid.J = 10, grid.K = 8, grid.dx = 1.0f, grid.dy = 2.0f;
        bed = bwtest::Constant(grid, -1.0f);
        xi0.assign(bed.size(), 0.0f);
        for (int k = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j) {
                if (j == 0 || k == 0 || j == grid.J || k == grid.K) bed[At(j, k)] = 1.0f;
                xi0[At(j, k)] =
                    0.02f * std::cos(3.14159f * j / 10) + 0.01f * std::cos(3.14159f * k / 8);
            }
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        bwtest::MapSpec surface = grid;
        surface.itemName = "Surface";
        bwtest::WriteMapFile(dir / "xi.xol2", surface, xi0);
    }
    bwtest::RunResult RunBasin(const std::string& span, const std::string& launcher = "") {
        return Run(
            "m", "bed.xol2",
            {{"SURFACE_ELEVATION", "SURFACE_TYPE = 1\n" + bwtest::DataFileSection("xi.xol2")},
             {"Area_Description", "True_land_value = 0.5\nReference_Level_Shift = 0\n"},
             {"Output_Deterministic_2D", AreaOutput(grid.J, grid.K)},
             {"Output_Hotstart_2D", HotstartSection("hot.xol2", span)}},
            launcher);
    }
    // The writes of the state file the log reports.
    size_t Writes() {
        const std::string log = bwtest::ReadFile(dir / "m.log"), title = "  Title  : State\n";
        size_t n = 0;
        for (size_t at = log.find(title); at != std::string::npos; at = log.find(title, at + 1))
            ++n;
        return n;
    }
};

TEST_F(HotstartBasin, TheFileHoldsTheStateOfTheLastDueStep) {
    // The default span: one write, after the last of the 10 steps.
    bwtest::RunResult r = RunBasin("");
    ASSERT_EQ(r.exitCode, 0) << r.out;
    EXPECT_EQ(Writes(), 1u);
    EXPECT_FALSE(fs::exists(dir / "hot.xol2.tmp"));
    XolFile f = XolOpenRead(dir / "hot.xol2");
    ASSERT_EQ(f.noDynamicItems, 18);
    std::ostringstream shape;
    shape << f.dimension << "D, type " << f.dataType << ", " << f.noDynamicItems << "+"
          << f.noStaticItems << " items, " << f.noTimeSteps << " x from " << f.startDateTime
          << ", land " << f.misc[3] << ", " << f.projection << ", " << f.axes[0].count << " x "
          << f.axes[0].spacing << ", " << f.axes[1].count << " x " << f.axes[1].spacing
          << ", types " << f.dynamicItems[3].type << " " << f.dynamicItems[8].type;
    EXPECT_EQ(shape.str(),
              "2D, type 11, 18+0 items, 1 x from 2004-01-01 00:00:01, land 0.5, NON-UTM, "
              "11 x 1, 9 x 2, types 100080 999");
    std::string names;
    for (int n = 0; n < f.noDynamicItems; ++n) names += f.dynamicItems[n].name + ";";
    EXPECT_EQ(names,
              "Misc. scalars;Z;S;P;Q;S (old).;P (old);Q (old);pxyt (extrapolated);"
              "qxyt (extrapolated);tanphi;delta;cx;cy;sp;sq;sp (old);sq (old);");
    XolClose(f);

    const Records hot = ReadRecords(dir / "hot.xol2"), area = ReadRecords(dir / "area.xol2");
    ASSERT_EQ(area.size(), 10u);
    // The scalars: grid, step, day number of the start, land value, ...
    const std::vector<float>& s = hot[0][0];
    std::vector<float> scalars(s.size(), kDelete);
    const std::pair<int, float> set[] = {
        {1, 10.0f}, {2, 8.0f},  {3, 1.0f},  {4, 2.0f},  {5, 0.1f},  {7, 12418.0f}, {8, 0.0f},
        {9, 0.0f},  {10, 1.0f}, {11, 0.0f}, {15, 0.0f}, {16, 0.0f}, {17, 0.5f},    {20, 1.0f}};
    for (const auto& [at, value] : set) scalars[at] = value;
    for (size_t i = 0; i < s.size(); ++i) EXPECT_NEAR(s[i], scalars[i], 1e-6f) << "element " << i;
    EXPECT_EQ(hot[0][1], bed);
    // Surface and fluxes those of step 10 wherever the area file has them.
    for (size_t p = 0; p < bed.size(); ++p)
        for (int i : {0, 1, 2})
            EXPECT_EQ(area[9][i][p] == kDelete ? kDelete : hot[0][2 + i][p], area[9][i][p]) << p;
    EXPECT_NE(hot[0][2], hot[0][5]);  // xi has moved on from xiPrev
    for (int n = 10; n < 18; ++n)     // no rollers, no generation: zero maps
        EXPECT_TRUE(std::ranges::all_of(hot[0][n], [](float v) { return v == 0.0f; })) << n;

    // Step 0 only: the state before the first step (land laid just dry).
    ASSERT_EQ(RunBasin(Span(0, 0)).exitCode, 0);
    const Records at0 = ReadRecords(dir / "hot.xol2");
    for (size_t p = 0; p < bed.size(); ++p)
        if (bed[p] < 0.5f) {
            EXPECT_EQ(at0[0][2][p], xi0[p]) << p;
            EXPECT_EQ(at0[0][5][p], xi0[p]) << p;
        }

    // Steps 0, 4 and 8: three writes, the last one stays.
    ASSERT_EQ(RunBasin("First_Time_Step = 0\nTime_Step_Interval = 4\n").exitCode, 0);
    EXPECT_EQ(Writes(), 3u);
    f = XolOpenRead(dir / "hot.xol2");
    EXPECT_EQ(f.startDateTime, "2004-01-01 00:00:00");
    EXPECT_NEAR(f.startOffset, 0.8, 1e-9);
    XolClose(f);
    const Records at8 = ReadRecords(dir / "hot.xol2"), area8 = ReadRecords(dir / "area.xol2");
    EXPECT_EQ(at8[0][0][10], 0.8f);  // the second of the step
    for (size_t p = 0; p < bed.size(); ++p)
        EXPECT_EQ(area8[7][0][p] == kDelete ? kDelete : at8[0][2][p], area8[7][0][p]) << p;
}

// A write that fails leaves the former file as it was: the new one goes to a
// temporary name and replaces the former once whole on disk. A temporary
// name taken by a folder, and a limit on the size of the process's files (its
// signal ignored) standing in for a full disk, both stop the run.
TEST_F(HotstartBasin, AFailedWriteLeavesTheFormerFileWhole) {
    ASSERT_EQ(RunBasin(Span(0, 0)).exitCode, 0);
    const std::string hot = dir / "hot.xol2", temporary = dir / "hot.xol2.tmp";
    const std::string good = bwtest::ReadFile(hot);
    fs::create_directory(temporary);
    bwtest::RunResult r = RunBasin(Span(0, 0));
    EXPECT_EQ(r.out, "Unable to create file for " + hot + ": is a directory\n");
    EXPECT_TRUE(fs::is_directory(temporary));
    EXPECT_EQ(bwtest::ReadFile(hot), good);
    fs::remove(temporary);
    // A limit some 4 kB below the size of the file (the log stays below it).
    r = RunBasin(Span(0, 0),
                 "trap '' XFSZ; ulimit -f " + std::to_string(good.size() / 512 - 8) + ";");
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "Flush error: " + hot + ": file too large\n");
    EXPECT_TRUE(EndsAbnormally());
    EXPECT_FALSE(fs::exists(temporary));
    EXPECT_EQ(bwtest::ReadFile(hot), good);
}

// A state file without all its items stops in the data layer at the first
// item that is missing (a file that is no state file: the model reader's test).
TEST_F(HotstartBasin, AStateFileWithoutItsItemsIsRefused) {
    bwtest::MapSpec flagged = grid;
    flagged.dataType = 11;
    bwtest::WriteMapFile(dir / "one.xol2", flagged, bed);
    const bwtest::RunResult r =
        Run("m", "one.xol2",
            {{"Bathymetry_Selection", "Hot_Start = true\n" + bwtest::DataFileSection("one.xol2")},
             {"SURFACE_ELEVATION", "-"}});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "TRNXOL Error: Unable to read dynamic item: " + dir / "one.xol2" +
                         ": no more data: the file holds 1 step of 1 item\n");
    EXPECT_TRUE(EndsAbnormally());
}

// A channel of 31 x 5 points, water in the rows k = 1..3, driven by a level
// boundary at the east end (j = 30; mirrored, at j = 0) with a sine of period
// T and amplitude a that grows over two periods. A beach rises from 0.6 m
// below the datum at the boundary to 0.12 m beside the wall, where waves break.
class HotstartChannel : public Hotstart {
protected:
    static constexpr double kDt = 0.1;
    double amplitude = 0.05, period = 2.5;
    int32_t boundaryJ = 30;
    void SetUp() override {
        grid.J = 30, grid.K = 4;
        WriteChannel(false);
    }
    void WriteChannel(bool beach, bool west = false) {
        boundaryJ = west ? 0 : grid.J;
        bed = bwtest::Constant(grid, 1.0f);
        for (int k = 1; k < grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j) {
                const int fromWall = west ? grid.J - 1 - j : j - 1;
                if (fromWall >= 0)
                    bed[At(j, k)] =
                        beach ? -0.12f - 0.48f * static_cast<float>(fromWall) / (grid.J - 1)
                              : -1.0f;
            }
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        bwtest::WriteSeriesFile(dir / "level.xol0", "2004-01-01 00:00:00", kDt,
                                {bwtest::RampedSine(amplitude, period, kDt, 400, 2.0)});
    }
    // A run of `steps` steps from `start` seconds after midnight, its area
    // output to `area`.
    Sections Model(int steps, int start, const std::string& area, Sections others) const {
        std::ostringstream time, boundary;
        time << "Time_step_count = " << steps << "\nTime_step_interval = " << kDt
             << "\nWarm_up_period = 0\nStart_time = 2004, 1, 1, 0, 0, " << start << "\n";
        boundary << "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = " << boundaryJ
                 << ", 1\nLast_Point = " << boundaryJ << ", " << grid.K - 1
                 << "\nFormulation = 0\nData_Specification = 0\n"
                 << bwtest::DataFileSection("level.xol0") << "}\n";
        others["Simulation_Period"] = time.str();
        others["Boundary_Location"] = boundary.str();
        others["Output_Deterministic_2D"] = AreaOutput(grid.J, grid.K, area);
        return others;
    }
    // The differences of the area items (surface, P, Q, roller thickness)
    // between the second run and the unbroken one: the largest over the
    // second run, and whether all agree to the last bit.
    struct Split {
        float most[4] = {0, 0, 0, 0};
        bool identical = true;
        float waveHeight = 0;  // the largest surface range at a point of the unbroken run
        float flux = 0;        // the largest |P| of the unbroken run
        std::string Text() const {
            std::ostringstream s;
            s << "wave height " << waveHeight << " m, largest P " << flux << " m2/s; differences:";
            const char* names[] = {"xi", "P", "Q", "delta"};
            for (int i = 0; i < 4; ++i) s << " " << names[i] << " " << most[i];
            return s.str();
        }
    };
    Split RunSplit(int steps, int n1, const Sections& processes) {
        Sections first = processes, second = processes;
        first["Output_Hotstart_2D"] = HotstartSection("half.xol2", Span(n1, n1));
        bwtest::RunResult r = Run("whole", "bed.xol2", Model(steps, 0, "whole.xol2", first));
        EXPECT_EQ(r.exitCode, 0) << r.out;
        second["Bathymetry_Selection"] =
            "Hot_Start = true\n" + bwtest::DataFileSection("half.xol2");
        second["SURFACE_ELEVATION"] = "-";
        const int start = static_cast<int>(std::lround(n1 * kDt));  // n1 on a whole second
        r = Run("second", "half.xol2", Model(steps - n1, start, "second.xol2", second));
        EXPECT_EQ(r.exitCode, 0) << r.out;
        const Records whole = ReadRecords(dir / "whole.xol2"),
                      rest = ReadRecords(dir / "second.xol2");
        Split d;
        if (whole.size() != static_cast<size_t>(steps) || rest.size() != whole.size() - n1) {
            ADD_FAILURE() << "records: " << whole.size() << ", " << rest.size();
            d.identical = false;
            return d;
        }
        for (size_t m = 0; m < rest.size(); ++m)
            for (int i = 0; i < 4; ++i) {
                const std::vector<float>&a = whole[n1 + m][i], &b = rest[m][i];
                d.identical = d.identical && std::memcmp(a.data(), b.data(), a.size() * 4) == 0;
                for (size_t p = 0; p < a.size(); ++p)
                    d.most[i] = std::max(d.most[i], std::fabs(a[p] - b[p]));
            }
        for (size_t p = 0; p < bed.size(); ++p) {
            float low = 1e30f, high = -1e30f;
            for (const auto& record : whole) {
                if (record[0][p] == kDelete) continue;
                low = std::min(low, record[0][p]), high = std::max(high, record[0][p]);
                d.flux = std::max(d.flux, std::fabs(record[1][p]));
            }
            d.waveHeight = std::max(d.waveHeight, high - low);
        }
        return d;
    }
    // A generation line across the channel at j = 15 fed by a sine of flux
    // amplitude s (m2/s) and the channel's period: a series (Wave_Type 0) or
    // a line file of its three points (1).
    Sections Generation(int waveType, double s) {
        const std::vector<float> flux = bwtest::RampedSine(s, period, kDt, 400, 2.0),
                                 zero(400, 0.0f);
        const std::string file = waveType == 0 ? "gen.xol0" : "gen.xol1";
        if (waveType == 0)
            bwtest::WriteSeriesFile(dir / file, "2004-01-01 00:00:00", kDt, {flux, zero});
        else
            bwtest::WriteUniformLineFile(dir / file, "2004-01-01 00:00:00", kDt, grid.dy, 3,
                                         {flux, zero});
        return {
            {"Internal_Generation", "Number_Of_Records = 1\n" +
                                        bwtest::GenerationRecord(1, 15, 1, 15, 3, waveType, file)}};
    }
};

// Without rollers and generation the file holds the whole state: the second
// run repeats the unbroken one bit for bit (split after an even step, so that
// both take the lines of the next step in the same order). A boundary on the
// west edge keeps the flux across it in a row outside the fields, which the
// file does not hold, so the second run starts it at 0. Measured: surface
// 2.2 mm in waves of 94 mm, P 0.017 m2/s of 0.15.
TEST_F(HotstartChannel, ARunSplitInTwoGoesOnBitForBitButForAWestBoundary) {
    Split d = RunSplit(60, 20, {});
    EXPECT_TRUE(d.identical) << d.Text();
    EXPECT_GT(d.waveHeight, 0.05f);
    WriteChannel(false, true);
    d = RunSplit(60, 20, {});
    EXPECT_FALSE(d.identical);
    EXPECT_LT(d.most[0], 0.03f * d.waveHeight) << d.Text();
    EXPECT_LT(d.most[1], 0.15f * d.flux) << d.Text();
}

// Split while waves break on the beach: the file holds the roller fields but
// not xiPrev2, which the first roller pass of the second run reads as 1e-10,
// so it lays rollers wherever the surface stands above tanPhi |c| dt.
// Measured: surface 11 mm in waves of 204 mm, P 0.023 m2/s of 0.24, roller
// thickness 7 mm.
TEST_F(HotstartChannel, ARestartDuringBreakingDiffersByLittle) {
    amplitude = 0.09, period = 1.5;
    WriteChannel(true);
    const Split d = RunSplit(260, 220,
                             {{"WAVE_BREAKING",
                               "type = 1\ndirection = 90\n"
                               "initial_breaking_angle = 10\nfinal_breaking_angle = 6\n"}});
    EXPECT_GT(*std::ranges::max_element(ReadRecords(dir / "half.xol2")[0][11]), 0.0f)
        << "no roller at the split";
    EXPECT_GT(d.most[3], 0.0f);
    EXPECT_LT(d.most[0], 0.08f * d.waveHeight) << d.Text();
    EXPECT_LT(d.most[1], 0.15f * d.flux) << d.Text();
    EXPECT_LT(d.most[3], 0.05f * d.waveHeight) << d.Text();
}

// The file holds the sources of the present and the last half step. A line
// fed by a series also keeps the half-step value of its record, which the
// second run starts at 0, halving its first source value. Measured: surface
// 1.4 mm in waves of 94 mm, P 0.003 m2/s. A line file is
// read afresh from the second run's start and agrees to rounding (5e-8 m).
TEST_F(HotstartChannel, ARestartWithInternalGeneration) {
    const double c = std::sqrt(9.81);  // a = s/c in 1 m of water
    Split d = RunSplit(60, 20, Generation(0, 0.03 * c));
    EXPECT_LT(d.most[0], 0.03f * d.waveHeight) << d.Text();
    EXPECT_LT(d.most[1], 0.04f * d.flux) << d.Text();
    EXPECT_GT(d.most[0], 1e-4f * d.waveHeight) << d.Text();
    d = RunSplit(60, 20, Generation(1, 0.03 * c));
    EXPECT_LT(d.most[0], 1e-5f * d.waveHeight) << d.Text();
    EXPECT_LT(d.most[1], 1e-5f * d.flux) << d.Text();
}

}  // namespace
