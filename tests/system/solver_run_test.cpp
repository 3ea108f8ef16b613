// The 2DH solver run from model files: a closed basin with output and the
// chain tables of -debug:3, the blow-up stops with the point that failed,
// and a cancel in the middle of the time loop.
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "data/xolfile.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;
using bwtest::MapSpec;
using bwtest::ModelText;
using bwtest::RunProgram;
using bwtest::RunResult;

namespace {

class SolverRun : public testing::Test {
protected:
    bwtest::TempDir dir;
    std::string bw = bwtest::BuiltProgram("bw");
    MapSpec grid;

    // A basin of 1 m depth with land all round; change(bed) may alter it.
    void WriteBasin(const std::function<void(std::vector<float>&)>& change = {}) {
        std::vector<float> bed = bwtest::Constant(grid, -1.0f);
        for (int k = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j)
                if (j == 0 || k == 0 || j == grid.J || k == grid.K)
                    bed[k * (grid.J + 1) + j] = 1.0f;
        if (change) change(bed);
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
    }
    RunResult Run(const std::string& text, std::vector<std::string> args = {}) {
        bwtest::WriteFile(dir / "m.bw", text);
        args.insert(args.begin(), bw);
        args.push_back("m.bw");
        return RunProgram(args, dir.path.string(), {{"TARN_PROGRESS", "NONE"}},
                          {"BUILDMODE", "TRF"});
    }
    std::string Log() { return bwtest::ReadFile(dir / "m.log"); }
};

const char* kSurfaceOutput = R"(Number_Of_Records = 1
Output_Spec_Data_1 {
    File_Name = file("out.xol2")
    X_Range_And_Interval = 0, 10, 1
    Y_Range_And_Interval = 0, 10, 1
    First_Time_step = 1
    Last_Time_step = 1000
    Time_Step_Interval = 1
    Number_Of_Items = 2
    Item_Numbers = 1, 3
    Title = "Basin"
}
)";

TEST_F(SolverRun, ABasinRunsItsStepsWritesEveryStepAndAtDebugLevelThreeItsChainTables) {
    WriteBasin();
    RunResult r = Run(
        ModelText("bed.xol2", {{"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0.01\n"},
                               {"Output_Deterministic_2D", kSurfaceOutput}}),
        {"-debug:3"});
    ASSERT_EQ(r.exitCode, 0) << r.out << Log();
    const std::string log = Log();
    for (const char* expected :
         {"2D Wave Simulation", "Number of water points                             81",
          "Number of time steps                               10", "Grid codes (x-dir.)",
          "Grid codes (y-dir.)", "Chains (x-dir.)", "   k  no : (first,last) ...",
          "    5   1 : (1,9)", "Chains (y-dir.)", "   j  no : (first,last) ..."})
        EXPECT_NE(log.find(expected), std::string::npos) << expected;
    XolFile f = XolOpenRead(dir / "out.xol2");
    EXPECT_EQ(f.noTimeSteps, 10);
    EXPECT_EQ(f.noDynamicItems, 2);
    std::vector<float> xi(121);
    XolReadDynamic(f, xi.data());
    EXPECT_NEAR(xi[5 * 11 + 5], 0.01f, 1e-6f);  // a still surface stays still
    XolClose(f);
}

TEST_F(SolverRun, BlowUpsNameThePointAndCloseTheOutputs) {
    auto at = [&](int j, int k) { return k * (grid.J + 1) + j; };
    // A flux boundary along the west edge, fed by a still series.
    const std::string westFlux =
        "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = 0, 1\nLast_Point = 0, 9\n"
        "Formulation = 1\nData_Specification = 0\nDATA_FILE {\nFile_name = file(\"level.xol0\")\n"
        "Item_Count = 1\nItem_Numbers = 1\n}\n}\n";
    bwtest::WriteSeriesFile(dir / "level.xol0", "2004-01-01 00:00:00", 0.1,
                            {std::vector<float>(20, 0.0f)});
    const struct {
        std::function<void(std::vector<float>&)> bed;
        std::string boundaries, text;
    } cases[] = {
        // A point so shallow that it counts as water but is below the least depth.
        {[&](std::vector<float>& b) { b[at(4, 4)] = -0.00005f; }, "",
         "Negative water depth, near (4,4)"},
        // Water up to the east edge of the grid with no boundary there.
        {[&](std::vector<float>& b) { b[at(10, 5)] = -1.0f; }, "",
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
        std::map<std::string, std::string> sections = {{"Output_Deterministic_2D", kSurfaceOutput}};
        if (!c.boundaries.empty()) sections["Boundary_Location"] = c.boundaries;
        RunResult r = Run(ModelText("bed.xol2", sections));
        EXPECT_EQ(r.exitCode, 255) << c.text << "\n" << r.out;
        const std::string log = Log();
        EXPECT_NE(log.find("---------- B L O W  -  U P  detected ---\n" + c.text +
                           "\n\nCOMPUTATION ENDED"),
                  std::string::npos)
            << c.text << "\n"
            << log.substr(log.size() > 3000 ? log.size() - 3000 : 0);
        EXPECT_NE(log.find("Abnormal completion"), std::string::npos);
        // The output was closed: its summary stands in the log and the file opens.
        EXPECT_NE(log.find("Data File Summary"), std::string::npos);
        int status = -1;
        XolFile f = XolOpenRead(dir / "out.xol2", &status);
        EXPECT_EQ(status, 0);
        if (status == 0) XolClose(f);
    }
}

TEST_F(SolverRun, AKillFileCancelsTheTimeLoopAndTheOutputsAreClosed) {
    grid.J = grid.K = 60;
    WriteBasin();
    std::string text =
        ModelText("bed.xol2", {{"Simulation_Period",
                                "Time_step_count = 1000000\nTime_step_interval = 0.05\n"
                                "Start_time = 2004, 1, 1, 0, 0, 0\n"},
                               {"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0.01\n"},
                               {"Output_Deterministic_2D", kSurfaceOutput}});
    bwtest::WriteFile(dir / "m.bw", text);
    std::thread killer([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(1500));
        bwtest::WriteFile(dir / "m._kill_", "");
    });
    RunResult r =
        RunProgram({bw, "m.bw"}, dir.path.string(), {}, {"BUILDMODE", "TRF", "TARN_PROGRESS"});
    killer.join();
    EXPECT_EQ(r.exitCode, 255);
    const std::string log = Log();
    EXPECT_NE(log.find("Run Statistics"), std::string::npos);
    EXPECT_NE(log.find("Data File Summary"), std::string::npos);
    XolFile f = XolOpenRead(dir / "out.xol2");
    EXPECT_GT(f.noTimeSteps, 0);
    EXPECT_LT(f.noTimeSteps, 1000000);
    XolClose(f);
}

}  // namespace
