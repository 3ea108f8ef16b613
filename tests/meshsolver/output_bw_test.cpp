// The output of 1DH runs from the model file to the files written: point
// series, lines, wave statistics and the runup, read back and held against
// the model's state; the statistics along a flume against the same
// statistics computed off-line from the stored series; the closing block of
// a run that blows up; the runup on a hand-made profile; and the records
// of a model file that the output setup refuses.
#include "meshsolver/output_bw.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <functional>
#include <sstream>

#include "input/kvt_access.hpp"
#include "mesh/mesh.hpp"
#include "meshsolver/bw_model.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "run/timing.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;

constexpr int kJ = 20;  // points 0..20: nodes 1..21
constexpr float kDx = 2.5f;
constexpr double kDt = 0.05;
constexpr float kNoStatistic = -1.0e-30f;
constexpr float kDelete = 1.0e-35f;  // the delete value of the mesh solver's files

std::string Period(int steps) {
    std::ostringstream s;
    s << "Time_step_count = " << steps << "\nTime_step_interval = " << kDt
      << "\nWarm_up_period = 0\nStart_time = 2004, 1, 1, 0, 0, 0\n";
    return s.str();
}

std::string Record(int n, const std::string& body) {
    return "OUTPUT_SPEC_DATA_" + std::to_string(n) + " {\n" + body + "}\n";
}
std::string One(const std::string& body) {
    return "Number_Of_Records = 1\n" + Record(1, body);
}

// A record of the deterministic or statistics list: a point series at the
// grid indices `where` (file .xol0) or a line over them (.xol1).
std::string Places(const std::string& file, const std::string& where, int points) {
    const bool line = file.find(".xol1") != std::string::npos;
    return "File_Name = file(\"" + file + "\")\n" + (line ? "No_of_points = " : "NO_OF_POINTS = ") +
           std::to_string(points) + "\nX_Range_And_Interval = " + where + "\n";
}
std::string Span(int first, int last, int interval, const std::string& items) {
    const int count = static_cast<int>(std::count(items.begin(), items.end(), ',')) + 1;
    return "First_Time_step = " + std::to_string(first) +
           "\nLast_Time_step = " + std::to_string(last) +
           "\nTime_Step_Interval = " + std::to_string(interval) +
           "\nNumber_Of_Items = " + std::to_string(count) + "\nItem_Numbers = " + items + "\n";
}

// A flux boundary at both ends of the line, from the series file.
std::string FluxAtBothEnds(const std::string& file) {
    return "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = 0, 0\nLast_Point = 0, 0\n"
           "Formulation = 1\nData_Specification = 0\nDATA_FILE {\nFile_name = file(\"" +
           file + "\")\nItem_Count = 1\nItem_Numbers = 1\n}\n}\n";
}

class OutputRun : public testing::Test {
protected:
    bwtest::TempDir dir;

    void SetUp() override {
        std::vector<float> bed(kJ + 1, -2.0f);
        Bed(bed);
    }
    void Bed(const std::vector<float>& bed) {
        bwtest::WriteLineFile(dir / "line.xol1", "2004-01-01 00:00:00", 1.0, kDx, {{bed}});
    }
    // The engine writes the solver file of the model; edit has its say on
    // it, and the mesh solver runs it in this process.
    int32_t RunInProcess(const Sections& given, std::string& out,
                         const std::function<void(std::string&)>& edit = {}) {
        bwtest::WriteFile(dir / "m.bw",
                          bwtest::ModelText("line.xol1", bwtest::ProfileSections(given)));
        const bwtest::RunResult r = bwtest::RunProgram(
            {bwtest::BuiltProgram("bw"), "-check", "m.bw"}, dir.path.string(),
            {{"TARN_PROGRESS", "NONE"}, {"OMP_NUM_THREADS", "1"}}, {"BUILDMODE", "TRF"});
        EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
        std::string fem = bwtest::ReadFile(dir / "m.bw_FEM.kvt");
        if (edit) edit(fem);
        bwtest::WriteFile(dir / "m.bw_FEM.kvt", fem);
        const std::filesystem::path cwd = std::filesystem::current_path();
        std::filesystem::current_path(dir.path);
        ResetMeshModel();
        ResetBwModel();
        InitTiming(gOverallTiming, "Overall", 4);
        for (int task = 1; task <= 4; ++task) AddTiming(gOverallTiming, task, "task");
        std::string logName = "m.bw";
        int32_t status = 0;
        testing::internal::CaptureStdout();
        RunMeshSolver("m.bw_FEM.kvt", logName, status);
        out = testing::internal::GetCapturedStdout();
        std::filesystem::current_path(cwd);
        return status;
    }
    bwtest::DataFile Read(const std::string& name) const {
        return bwtest::ReadDataFile(dir / name);
    }
};

// Replaces the value of the first key after `after` in the solver file.
void SetKey(std::string& fem, const std::string& after, const std::string& key,
            const std::string& value) {
    const size_t from = fem.find(after);
    ASSERT_NE(from, std::string::npos) << after;
    const size_t at = fem.find(key + " = ", from);
    ASSERT_NE(at, std::string::npos) << key;
    fem.replace(at, fem.find('\n', at) - at, key + " = " + value);
}

// A still flume, 10 steps: every block of the point file holds the still
// state at the gauges; the line starts one spacing left of the mesh, where
// its place holds the delete value, and its places between nodes read the
// straight line between them; the runup of a profile under water has no
// crossing. The files are closed and summarised after the computation.
TEST_F(OutputRun, StillFlumeFilesHoldTheState) {
    const Sections model = {
        {"Simulation_Period", Period(10)},
        {"OUTPUT_DETERMINISTIC_1D",
         "Number_Of_Records = 2\n" +
             Record(1, Places("gauges.xol0", "0, 4, 20", 3) + Span(0, 10, 1, "3, 4, 5, 12, 9")) +
             Record(2, Places("line.xol1", "0, 20", 41) + Span(2, 10, 4, "3, 5") +
                           "Title = \"Along\"\n")},
        {"OUTPUT_MOVING_SHORELINE_1D",
         "INCLUDE_CALCULATION = true\n" +
             Record(1,
                    "File_Name = file(\"shore.xol0\")\nLast_Time_step = 10\n"
                    "Number_Of_Items = 3\n")}};
    std::string out;
    ASSERT_EQ(RunInProcess(model, out,
                           [](std::string& fem) {
                               SetKey(fem, "OUTPUT_FILE_2", "x_origo", "-1.25");
                               SetKey(fem, "OUTPUT_FILE_2", "x_npoints", "42");
                           }),
              0)
        << out;

    const bwtest::DataFile gauges = Read("gauges.xol0");
    ASSERT_EQ(gauges.header.noDynamicItems, 15);  // 5 items at 3 points, item by item
    EXPECT_EQ(gauges.header.dynamicItems[2].name, "Surf. elevation");
    EXPECT_EQ(gauges.header.dynamicItems[3].name, "Total W. depth");
    EXPECT_EQ(gauges.header.deleteValue, kDelete);
    ASSERT_EQ(gauges.records.size(), 11u);  // the start state and 10 steps
    for (const auto& block : gauges.records)
        for (int p = 0; p < 3; ++p) {
            EXPECT_EQ(block[p][0], 0.0f);
            EXPECT_EQ(block[3 + p][0], 2.0f);
            EXPECT_EQ(block[6 + p][0], -2.0f);
            EXPECT_EQ(block[9 + p][0], 1.0f) << "no sponge: a factor of 1";
            EXPECT_EQ(block[12 + p][0], 0.0f);
        }

    const bwtest::DataFile line = Read("line.xol1");
    EXPECT_EQ(line.header.title, "Along");
    EXPECT_EQ(line.header.axes[0].count, 42);
    EXPECT_EQ(line.header.axes[0].spacing, 1.25f);
    EXPECT_EQ(line.header.axes[0].origin, -1.25f);
    EXPECT_EQ(line.header.misc[3], 10.0f) << "the land value";
    EXPECT_EQ(line.header.startDateTime, "2004-01-01 00:00:00");  // 2 x 0.05 s: a fraction
    EXPECT_NEAR(line.header.startOffset, 0.1, 1e-9);
    EXPECT_NEAR(line.header.timeStep, 4 * kDt, 1e-12);
    ASSERT_EQ(line.records.size(), 3u);  // steps 2, 6, 10
    for (const auto& block : line.records)
        for (int p = 0; p < 42; ++p) {
            EXPECT_EQ(block[0][p], p == 0 ? kDelete : 0.0f) << p;
            EXPECT_EQ(block[1][p], p == 0 ? kDelete : -2.0f) << p;
        }

    const bwtest::DataFile shore = Read("shore.xol0");
    ASSERT_EQ(shore.records.size(), 11u);
    for (const auto& block : shore.records)
        for (const auto& item : block) EXPECT_EQ(item[0], kDelete);
    EXPECT_FALSE(gOutputBW.runupReferenceSet);

    EXPECT_LT(out.find("COMPUTATION ENDED"), out.find("Output Statistics"));
}

// Waves driven at both ends through a flume of 21 nodes. The statistics
// line written at two times equals, node by node, the statistics computed
// off-line from the surface series stored at three gauges every step; the
// last block of the line is the model's surface; the "U velocity" at an
// end node is its "P flux".
TEST_F(OutputRun, StatisticsAlongTheFlumeEqualThoseOfTheStoredSeries) {
    const int steps = 240, half = steps / 2;
    bwtest::WriteSeriesFile(dir / "q.xol0", "2004-01-01 00:00:00", kDt,
                            {bwtest::RampedSine(0.05, 2.0, kDt, steps + 2, 1.0)});
    const Sections model = {
        {"Simulation_Period", Period(steps)},
        {"Boundary_Location", FluxAtBothEnds("q.xol0")},
        {"OUTPUT_DETERMINISTIC_1D",
         "Number_Of_Records = 2\n" +
             Record(1, Places("gauges.xol0", "4, 10, 16", 3) + Span(0, steps, 1, "3")) +
             Record(2, Places("surface.xol1", "0, 20", 21) + Span(0, steps, steps, "3, 1, 9"))},
        {"OUTPUT_STATISTIC_1D",
         "Number_Of_Records = 1\nType = 1\nNumber_Of_First_Wave = 0\nFirst_Time_Step = 0\n"
         "Last_Time_Step = " +
             std::to_string(steps) + "\nTime_Step_Interval = " + std::to_string(half) + "\n" +
             Record(1, Places("stat.xol1", "0, 20", 21) +
                           "Number_Of_Items = 5\nItem_Numbers = 1, 3, 4, 5, 17\n")}};
    std::string out;
    ASSERT_EQ(RunInProcess(model, out), 0) << out;

    const bwtest::DataFile gauges = Read("gauges.xol0");
    const bwtest::DataFile stat = Read("stat.xol1");
    ASSERT_EQ(gauges.records.size(), static_cast<size_t>(steps + 1));
    ASSERT_EQ(stat.records.size(), 3u);  // steps 0, 120, 240
    EXPECT_EQ(stat.header.dynamicItems[0].name, "Sign. Wave Height");
    for (int i = 0; i < 4; ++i) EXPECT_EQ(stat.records[0][i][10], kNoStatistic) << "no sample yet";

    double worst = 0.0;
    for (int b = 1; b <= 2; ++b) {
        const int m = b * half;  // the sums hold steps 1..m
        for (int g = 0; g < 3; ++g) {
            const int j = 4 + 6 * g;
            double s1 = 0.0, s2 = 0.0, top = 0.0, bottom = 0.0;  // extremes start at 0
            for (int n = 1; n <= m; ++n) {
                const double eta = gauges.records[n][g][0];
                s1 += eta, s2 += eta * eta;
                top = std::max(top, eta), bottom = std::min(bottom, eta);
            }
            const double hs = 4.0 * std::sqrt((s2 - s1 * s1 / m) / (m - 1));
            const double expected[4] = {hs, top, bottom, s1 / m};
            for (int i = 0; i < 4; ++i) {
                const double written = stat.records[b][i][j];
                const double scale = std::max(std::fabs(expected[i]), 1e-3);
                worst = std::max(worst, std::fabs(written - expected[i]) / scale);
                EXPECT_NEAR(written, expected[i], 1e-5 * scale) << "item " << i << " at " << j;
            }
        }
    }
    std::printf("statistics against the stored series: max relative difference %.3g\n", worst);
    const std::vector<float>& hs = stat.records[2][0];
    EXPECT_GT(*std::max_element(hs.begin(), hs.end()), 0.01f) << "the waves are not trivial";
    EXPECT_LT(stat.records[2][2][4], -0.005f);

    const bwtest::DataFile surface = Read("surface.xol1");
    ASSERT_EQ(surface.records.size(), 2u);
    for (int j = 0; j <= kJ; ++j)
        EXPECT_FLOAT_EQ(surface.records[1][0][j], static_cast<float>(gBwModel.Elevation[j + 1]));
    EXPECT_EQ(surface.records[1][1][0], surface.records[1][2][0]);
    EXPECT_EQ(surface.records[1][1][kJ], surface.records[1][2][kJ]);
    EXPECT_NE(surface.records[1][1][0], 0.0f);
}

// A flux that empties a shallow basin dries it and ends the run as a
// blow-up: every file gets the closing block behind the last step done and
// is closed readable; the closing block of the statistics has no valid
// node, the filtered surface stays a number.
TEST_F(OutputRun, BlowUpWritesTheClosingBlock) {
    Bed(std::vector<float>(kJ + 1, -1.0f));
    bwtest::WriteSeriesFile(dir / "q.xol0", "2004-01-01 00:00:00", 1.0,
                            {std::vector<float>(12, -5.0f)});
    const Sections model = {
        {"Simulation_Period", Period(200)},
        {"Boundary_Location", FluxAtBothEnds("q.xol0")},
        {"OUTPUT_DETERMINISTIC_1D",
         One(Places("surface.xol1", "0, 20", 21) + Span(0, 200, 1, "3"))},
        {"OUTPUT_STATISTIC_1D",
         "Number_Of_Records = 1\nType = 2\nFirst_Time_Step = 0\nLast_Time_Step = 200\n"
         "Time_Step_Interval = 1\n" +
             Record(1, Places("stat.xol1", "0, 20", 21) +
                           "Number_Of_Items = 3\nItem_Numbers = 5, 1, 17\n")}};
    std::string out;
    ASSERT_EQ(RunInProcess(model, out), -1) << out;
    const int32_t k = gMeshRun.StepCounter;  // the step that blew up
    ASSERT_GT(k, 1);
    ASSERT_LT(k, 200);

    const bwtest::DataFile surface = Read("surface.xol1");
    ASSERT_EQ(surface.records.size(), static_cast<size_t>(k + 1));  // 0..k-1 and the closing one
    for (int j = 0; j <= kJ; ++j)
        EXPECT_FLOAT_EQ(surface.records[k][0][j], static_cast<float>(gBwModel.Elevation[j + 1]));
    const bwtest::DataFile stat = Read("stat.xol1");
    ASSERT_EQ(stat.records.size(), static_cast<size_t>(k + 1));
    EXPECT_LT(stat.records[k - 1][0][0], 0.0f) << "the mean falls while the basin empties";
    for (int j = 0; j <= kJ; ++j) {
        EXPECT_EQ(stat.records[k][0][j], kNoStatistic);
        EXPECT_EQ(stat.records[k][1][j], kNoStatistic);
        EXPECT_TRUE(std::isfinite(stat.records[k][2][j]));
        EXPECT_NE(stat.records[k][2][j], kNoStatistic);
    }
    EXPECT_LT(out.find("BLOW-UP"), out.find("Output Statistics"));
}

// Records of the model file that the mesh solver refuses: a point series
// or a line in a file that is not of its kind, a line that runs backwards,
// an item beyond the table of its kind.
TEST_F(OutputRun, ModelFilesTheOutputSetupRefuses) {
    const struct {
        std::string section, body, message;
    } cases[] = {
        {"OUTPUT_DETERMINISTIC_1D", One(Places("gauges.dt0", "4", 1) + Span(0, 5, 1, "3")),
         "SetupPointDomain: Wrong file type"},
        {"OUTPUT_DETERMINISTIC_1D", One(Places("line.dt1", "0, 20", 21) + Span(0, 5, 1, "3")),
         "SetupAreaDomain: Wrong file type"},
        {"OUTPUT_DETERMINISTIC_1D", One(Places("line.xol1", "20, 0", 21) + Span(0, 5, 1, "3")),
         "SetupAreaDomain: Grid spacing must be larger than zero"},
        {"OUTPUT_STATISTIC_1D", One(Places("stat.xol1", "0, 20", 21) + Span(0, 5, 1, "20")),
         "SpecPhaseAverageBW: Item type not supported"},
        {"OUTPUT_DETERMINISTIC_1D", One(Places("line.xol1", "0, 20", 21) + Span(0, 5, 1, "3, 15")),
         "SpecStandardBW: Item type not supported"},
        {"OUTPUT_MOVING_SHORELINE_1D",
         "INCLUDE_CALCULATION = true\n" +
             Record(1, "File_Name = file(\"r.xol0\")\nNumber_Of_Items = 4\n"),
         "SpecRunupBW: Item type not supported"},
    };
    for (const auto& c : cases) {
        bwtest::WriteFile(
            dir / "m.bw",
            bwtest::ModelText(
                "line.xol1",
                bwtest::ProfileSections({{"Simulation_Period", Period(5)}, {c.section, c.body}})));
        const bwtest::RunResult r =
            bwtest::RunProgram({bwtest::BuiltProgram("bw"), "m.bw"}, dir.path.string(),
                               {{"TARN_PROGRESS", "NONE"}}, {"BUILDMODE", "TRF"});
        EXPECT_EQ(r.exitCode, 1) << c.message;
        EXPECT_NE(r.out.find(c.message), std::string::npos) << r.out << r.err;
    }
}

// The runup on a hand-made beach from -2 m to +2 m (nodes at x = 0, 2, .., 8):
// the water line lies where eta + d changes sign, at the bed level there;
// the first crossing of the run is the reference of the total runup, which
// is negative below it. With all nodes wet, or all dry, all three values
// are the delete value and the reference stays unset. The k-th item takes
// the k-th value, whatever its number.
TEST(OutputRunup, WaterLineOnABeach) {
    bwtest::TempDir dir;
    bwtest::LogCapture log;
    ResetMeshModel();
    ResetBwModel();
    ResetOutputBW();
    Mesh& line = gMeshes.meshes[1];
    AllocateMesh(line, 5, 4, 2, "test");
    gBwModel.StillDepth.assign(6, 0.0);
    for (int32_t i = 1; i <= 5; ++i) {
        line.x[i] = 2.0 * (i - 1);
        gBwModel.StillDepth[i] = 3.0 - i;
    }
    for (int32_t e = 1; e <= 4; ++e) {
        line.ElementNodes[line.ElementStart[e]] = e;
        line.ElementNodes[line.ElementStart[e] + 1] = e + 1;
    }
    std::vector<OutputFile> records(1);
    OutputFile& r = records[0];
    r.file_name = dir / "runup.xol0";
    r.type = 3, r.format = 0, r.last_time_step = 10;
    r.type_of_variables = {3, 1, 2};
    SpecRunupBW(r, gBwModel);
    OpenOutputFiles(1, records);
    for (double level : {3.0, -3.0, 0.5, 1.5, -0.5}) {
        gBwModel.Elevation.assign(6, level);
        WriteRunupBW(r, gBwModel);
        EXPECT_EQ(gOutputBW.runupReferenceSet, level < 2.0 && level > -2.0) << level;
    }
    CloseOutputFiles(1, records);
    ResetMeshModel();
    ResetBwModel();

    const bwtest::DataFile runup = bwtest::ReadDataFile(dir / "runup.xol0");
    EXPECT_EQ(runup.header.dynamicItems[0].name, "Total runup");
    ASSERT_EQ(runup.records.size(), 5u);
    const float root5 = static_cast<float>(std::sqrt(5.0));
    const std::vector<std::vector<float>> expected = {{kDelete, kDelete, kDelete},
                                                      {kDelete, kDelete, kDelete},
                                                      {5.0f, 0.5f, 0.0f},
                                                      {7.0f, 1.5f, root5},
                                                      {3.0f, -0.5f, -root5}};
    for (size_t b = 0; b < 5; ++b)
        for (size_t k = 0; k < 3; ++k)
            EXPECT_FLOAT_EQ(runup.records[b][k][0], expected[b][k]) << b << " " << k;
}

}  // namespace
