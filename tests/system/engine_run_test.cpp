// The engine as a user meets it: started from the command line on small
// model files, judged by its exit code, what it prints, its log and its
// output. Bad starts, a basin run to its end (alone with the chain tables of
// -debug:3, and under a launcher), the blow-up stops with the point that
// failed, and a cancel in the middle of the time loop.
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <numbers>
#include <regex>
#include <thread>

#include "data/xolfile.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;
using bwtest::ModelText;
using bwtest::RunResult;

namespace {

class EngineRun : public testing::Test {
protected:
    bwtest::TempDir dir;
    std::string bw = bwtest::BuiltProgram("bw");
    bwtest::MapSpec grid;

    // A basin of 1 m depth with land all round; change(bed) may alter it.
    void WriteBasin(const std::function<void(std::vector<float>&)>& change = {}) {
        std::vector<float> bed = bwtest::Constant(grid, 1.0f);
        for (int k = 1; k < grid.K; ++k)
            for (int j = 1; j < grid.J; ++j) bed[k * (grid.J + 1) + j] = -1.0f;
        if (change) change(bed);
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
    }
    RunResult Run(std::vector<std::string> args) {
        args.insert(args.begin(), bw);
        return bwtest::RunProgram(args, dir.path.string(), {},
                                  {"BUILDMODE", "TRF", "TARN_PROGRESS"});
    }
    // Writes the text as m.bw and runs it, with an option before the file if given.
    RunResult RunModel(const std::string& text, const std::string& option = "") {
        bwtest::WriteFile(dir / "m.bw", text);
        return option.empty() ? Run({"m.bw"}) : Run({option, "m.bw"});
    }
};

const char* kSurfaceOutput = R"(Number_Of_Records = 1
Output_Spec_Data_1 {
    File_Name = file("out.xol2")
    X_Range_And_Interval = 0, 10, 1
    Y_Range_And_Interval = 0, 10, 1
    First_Time_step = 1
    Last_Time_step = 1000
    Item_Numbers = 1
}
)";

TEST_F(EngineRun, ABadStartStopsWithItsMessage) {
    // Before a model file is open nothing is written: no log, no channel.
    for (const auto& [arg, out] : {std::pair{"-debug", "Usage: bw [//hud] [options] kvt-file\n"},
                                   {"absent.bw", "TARNEL BW: Unable to open absent.bw\n"}}) {
        const RunResult r = Run({arg});
        EXPECT_EQ(std::make_pair(r.exitCode, r.out), std::make_pair(1, std::string(out)));
    }
    EXPECT_TRUE(fs::is_empty(dir.path));

    // Once it is open, the stop also ends the log; a syntax error is given
    // by its line and column behind the parser's text.
    WriteBasin();
    fs::create_directory(dir / "m._spi_");  // a folder where the channel should be
    const std::string syntax =
        "TARNEL_BOUSSINESQ_WAVE {\n  BASIC_MODEL_PARAMETERS {\n"
        "    NUMBER_OF_DIMENSIONS 2\n  }\n}\n";
    const struct {
        std::string stem, text, out;  // out: a pattern of the whole output
    } cases[] = {
        {"t", "OTHER_TARGET {\n}\n", "KVT target: TARNEL_BOUSSINESQ_WAVE not found\n"},
        {"s", "TARNEL_BOUSSINESQ_WAVE {\n}\n", "KVT section: BASIC_MODEL_PARAMETERS not found\n"},
        {"m", ModelText("bed.xol2"), "Unable to open Hud2 message file: m._spi_\n"},
        {"bad", syntax, "[^\n]+ near line 3 and colum 26 in file bad.bw\n"}};
    for (const auto& c : cases) {
        bwtest::WriteFile(dir / (c.stem + ".bw"), c.text);
        const RunResult r = Run({c.stem + ".bw"});
        EXPECT_EQ(r.exitCode, 1) << c.out;
        EXPECT_TRUE(std::regex_match(r.out, std::regex(c.out))) << r.out;
        EXPECT_TRUE(bwtest::ReadFile(dir / (c.stem + ".log")).ends_with("\nAbnormal completion\n"))
            << c.out;
    }
}

// A still basin at debug level 3: the log holds its blocks in order and the
// chain tables, the output every step, and the still surface stays still.
TEST_F(EngineRun, ABasinRunsToSuccessfulCompletion) {
    WriteBasin();
    bwtest::WriteFile(dir / "m._kill_", "left over from an earlier run");
    const RunResult r = RunModel(
        ModelText("bed.xol2", {{"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0.01\n"},
                               {"Output_Deterministic_2D", kSurfaceOutput}}),
        "-debug:3");
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_EQ(r.out, "Successful completion\n");
    // The log's blocks in order.
    const std::string log = bwtest::ReadFile(dir / "m.log");
    size_t at = 0;
    for (const char* expected :
         {"Computing Environment", "  Number of processes  : 1\n  Local process id     : -1\n",
          "Target: TARNEL_BOUSSINESQ_WAVE\n", "Grid codes (x-dir.)", "Grid codes (y-dir.)",
          "Chains (x-dir.)\n   k  no : (first,last) ...", "    5   1 : (1,9)",
          "Chains (y-dir.)\n   j  no : (first,last) ...",
          "Number of water points                             81",
          "Number of time steps                               10", " Overall Timings ",
          " Performance "}) {
        at = log.find(expected, at);
        ASSERT_NE(at, std::string::npos) << expected;
    }
    EXPECT_TRUE(log.ends_with("\nSuccessful completion\n"));
    // The channel starts at nothing done; a kill file left over is removed, not obeyed.
    EXPECT_EQ(bwtest::ReadFile(dir / "m._spi_").rfind("PROGRE          0\n", 0), 0u);
    EXPECT_FALSE(fs::exists(dir / "m._kill_"));
    XolFile f = XolOpenRead(dir / "out.xol2");
    EXPECT_EQ(f.noTimeSteps, 10);
    std::vector<float> xi(121);
    XolReadDynamic(f, xi.data());
    EXPECT_NEAR(xi[5 * 11 + 5], 0.01f, 1e-6f);
    XolClose(f);
}

TEST_F(EngineRun, UnderALauncherEachProcessWritesItsOwnFiles) {
    WriteBasin();
    bwtest::WriteFile(dir / "basin.bw", ModelText("bed.xol2"));
    RunResult r = bwtest::RunProgram(
        {"/usr/bin/mpirun", "--oversubscribe", "-n", "2", bw, "basin.bw"}, dir.path.string(),
        {{"OMPI_ALLOW_RUN_AS_ROOT", "1"},
         {"OMPI_ALLOW_RUN_AS_ROOT_CONFIRM", "1"},
         {"OMPI_MCA_btl", "self,vader"}},
        {"TARN_PROGRESS"});
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_FALSE(fs::exists(dir / "basin.log"));
    for (int p = 0; p < 2; ++p) {
        const std::string stem = dir / ("basin_p" + std::to_string(p));
        const std::string log = bwtest::ReadFile(stem + ".log");
        EXPECT_NE(log.find("  Number of processes  : 2\n  Local process id     : " +
                           std::to_string(p) + "\n"),
                  std::string::npos);
        EXPECT_TRUE(log.ends_with("\nSuccessful completion\n"));
        EXPECT_TRUE(fs::exists(stem + "._spi_"));
    }
}

TEST_F(EngineRun, BlowUpsNameThePointAndCloseTheOutputs) {
    auto at = [&](int j, int k) { return k * (grid.J + 1) + j; };
    // A flux boundary along the west edge, fed by a still series.
    const std::string westFlux =
        "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = 0, 1\nLast_Point = 0, 9\n"
        "Formulation = 1\nData_Specification = 0\n" +
        bwtest::DataFileSection("level.xol0") + "}\n";
    bwtest::WriteSeriesFile(dir / "level.xol0", "2004-01-01 00:00:00", 0.1,
                            {std::vector<float>(20, 0.0f)});
    const struct {
        std::function<void(std::vector<float>&)> bed;
        std::string boundaries, text;
    } cases[] = {
        // A point so shallow that it counts as water but is below the least depth.
        {[&](std::vector<float>& b) { b[at(4, 4)] = -0.00005f; }, "Number_Of_Boundaries = 0\n",
         "Negative water depth, near (4,4)"},
        // Water up to the east edge of the grid with no boundary there.
        {[&](std::vector<float>& b) { b[at(10, 5)] = -1.0f; }, "Number_Of_Boundaries = 0\n",
         "Undetected open east or north boundary point, near (10,5)"},
        // A west flux boundary on a row of one water point.
        {[&](std::vector<float>& b) {
             for (int k = 1; k <= 9; ++k) b[at(0, k)] = -1.0f;
             b[at(1, 5)] = 1.0f;
         },
         westFlux, "One point wide open flux boundary, near (0,5)"},
    };
    for (const auto& c : cases) {
        WriteBasin(c.bed);
        const RunResult r =
            RunModel(ModelText("bed.xol2", {{"Output_Deterministic_2D", kSurfaceOutput},
                                            {"Boundary_Location", c.boundaries}}));
        EXPECT_EQ(r.exitCode, 255) << c.text << "\n" << r.out;
        const std::string log = bwtest::ReadFile(dir / "m.log");
        // The point and the step.
        EXPECT_TRUE(std::regex_search(
            log, std::regex("---------- B L O W  -  U P  detected ---\n" +
                            std::regex_replace(c.text, std::regex("[()]"), "\\$&") +
                            "\nin time step [0-9]+\n\nCOMPUTATION ENDED")))
            << c.text;
        EXPECT_TRUE(log.ends_with("\nAbnormal completion\n"));
        // The output was closed: its summary stands in the log and the file opens.
        EXPECT_NE(log.find("Data File Summary"), std::string::npos);
        int status = -1;
        XolFile f = XolOpenRead(dir / "out.xol2", &status);
        EXPECT_EQ(status, 0);
        if (status == 0) XolClose(f);
    }
}

// bw -check reads the whole model with its data files and stops before the
// first step: no output is created, and the log and the screen say how
// finely the grid resolves the waves of a boundary. A broken model stops as
// a run would.
TEST_F(EngineRun, ACheckReadsTheModelAndComputesNoStep) {
    grid.J = 40, grid.K = 4, grid.dx = grid.dy = 0.25f;
    WriteBasin([&](std::vector<float>& b) {
        for (int k = 1; k < grid.K; ++k) b[k * (grid.J + 1)] = -1.0f;  // open to the west
    });
    bwtest::WriteSeriesFile(dir / "level.xol0", "2004-01-01 00:00:00", 0.05,
                            {bwtest::RampedSine(0.01, 2.0, 0.05, 401, 2.0)});
    const std::string boundary =
        "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = 0, 1\nLast_Point = 0, 3\n"
        "Formulation = 0\nData_Specification = 0\n" +
        bwtest::DataFileSection("level.xol0") + "}\n";
    const std::string period =
        "Time_step_count = 400\nTime_step_interval = 0.05\nStart_time = 2004, 1, 1, 0, 0, 0\n";
    const std::string output =
        "Number_Of_Records = 1\nOutput_Spec_Data_1 {\nFile_Name = file(\"out.xol2\")\n"
        "X_Range_And_Interval = 0, 40, 1\nY_Range_And_Interval = 0, 4, 1\nFirst_Time_step = 1\n"
        "Last_Time_step = 400\nItem_Numbers = 1\n}\n";
    const std::string text = ModelText("bed.xol2", {{"Simulation_Period", period},
                                                    {"Boundary_Location", boundary},
                                                    {"Output_Deterministic_2D", output}});
    RunResult r = RunModel(text, "-check");
    EXPECT_EQ(r.exitCode, 0) << r.out;
    // 1 m deep, T = 2 s: kh = 1.2303 by the equations without deep-water terms.
    const double L = 2 * std::numbers::pi / 1.2303;
    std::smatch m;
    ASSERT_TRUE(std::regex_search(
        r.out, m,
        std::regex("Boundary 1 \\(west, level\\): period ([0-9.]+) s, depth 1 m, wavelength "
                   "([0-9.]+) m: ([0-9.]+) points per wavelength \\(spacing 0.25 m\\), ([0-9.]+) "
                   "steps per period\n")))
        << r.out;
    EXPECT_NEAR(std::stod(m[1]), 2.0, 0.01);
    EXPECT_NEAR(std::stod(m[2]), L, 0.01 * L);
    EXPECT_NEAR(std::stod(m[3]), L / 0.25, 0.2);
    EXPECT_NEAR(std::stod(m[4]), 40.0, 0.2);
    const std::string log = bwtest::ReadFile(dir / "m.log");
    EXPECT_NE(log.find("Model Check"), std::string::npos);
    EXPECT_TRUE(log.ends_with("\nSuccessful completion\n"));
    EXPECT_FALSE(fs::exists(dir / "out.xol2"));

    // The option blanks a name before it, as -debug does; a broken model stops.
    EXPECT_EQ(Run({"m.bw", "-check"}).out, "Usage: bw [//hud] [options] kvt-file\n");
    r = RunModel(ModelText("absent.xol2"), "-check");
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_TRUE(bwtest::ReadFile(dir / "m.log").ends_with("\nAbnormal completion\n"));
}

TEST_F(EngineRun, AKillFileCancelsTheTimeLoopAndTheOutputsAreClosed) {
    grid.J = grid.K = 60;
    WriteBasin();
    std::thread killer([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(1500));
        bwtest::WriteFile(dir / "m._kill_", "");
    });
    const RunResult r = RunModel(
        ModelText("bed.xol2", {{"Simulation_Period",
                                "Time_step_count = 1000000\nTime_step_interval = 0.05\n"
                                "Start_time = 2004, 1, 1, 0, 0, 0\n"},
                               {"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0.01\n"},
                               {"Output_Deterministic_2D", kSurfaceOutput}}));
    killer.join();
    EXPECT_EQ(r.exitCode, 255);
    const std::string log = bwtest::ReadFile(dir / "m.log");
    EXPECT_NE(log.find("Run Statistics"), std::string::npos);
    EXPECT_NE(log.find("Data File Summary"), std::string::npos);
    XolFile f = XolOpenRead(dir / "out.xol2");
    EXPECT_GT(f.noTimeSteps, 0);
    EXPECT_LT(f.noTimeSteps, 1000000);
    XolClose(f);
}

}  // namespace
