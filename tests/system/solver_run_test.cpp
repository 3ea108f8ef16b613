// The 2DH solver run from model files: a closed basin with output, the
// blow-up stops with the point that failed, the chain tables of -debug:3,
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
                if (j == 0 || k == 0 || j == grid.J || k == grid.K) bed[k * (grid.J + 1) + j] = 1.0f;
        if (change) change(bed);
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
    }
    RunResult Run(const std::string& text, std::vector<std::string> args = {}) {
        bwtest::WriteFile(dir / "m.bw", text);
        args.insert(args.begin(), bw);
        args.push_back("m.bw");
        return RunProgram(args, dir.path.string(), {{"TARN_PROGRESS", "NONE"}}, {"BUILDMODE", "TRF"});
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

TEST_F(SolverRun, ABasinRunsItsStepsAndWritesEveryStep) {
    WriteBasin();
    RunResult r = Run(ModelText("bed.xol2",
                                {{"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0.01\n"},
                                 {"Output_Deterministic_2D", kSurfaceOutput}}));
    ASSERT_EQ(r.exitCode, 0) << r.out << Log();
    const std::string log = Log();
    EXPECT_NE(log.find("2D Wave Simulation"), std::string::npos);
    EXPECT_NE(log.find("Number of water points                             81"), std::string::npos) << log;
    EXPECT_NE(log.find("Number of time steps                               10"), std::string::npos);
    XolFile f = XolOpenRead(dir / "out.xol2");
    EXPECT_EQ(f.noTimeSteps, 10);
    EXPECT_EQ(f.noDynamicItems, 2);
    std::vector<float> xi(121);
    XolReadDynamic(f, xi.data());
    EXPECT_NEAR(xi[5 * 11 + 5], 0.01f, 1e-6f);  // a still surface stays still
    XolClose(f);
}

TEST_F(SolverRun, DebugLevelThreeWritesTheChainTables) {
    WriteBasin();
    ASSERT_EQ(Run(ModelText("bed.xol2"), {"-debug:3"}).exitCode, 0);
    const std::string log = Log();
    for (const char* heading : {"Grid codes (x-dir.)", "Grid codes (y-dir.)", "Chains (x-dir.)",
                                "   k  no : (first,last) ...", "Chains (y-dir.)",
                                "   j  no : (first,last) ..."})
        EXPECT_NE(log.find(heading), std::string::npos) << heading;
    EXPECT_NE(log.find("    5   1 : (1,9)"), std::string::npos);
}

TEST_F(SolverRun, BlowUpsNameThePointAndCloseTheOutputs) {
    struct Case {
        std::function<void(std::vector<float>&)> bed;
        std::string boundaries;
        std::string text;
    };
    auto at = [&](int j, int k) { return k * (grid.J + 1) + j; };
    const std::string level = R"(Number_Of_Boundaries = 1
BOUNDARY_DATA_1 {
    First_Point = %J1, %K1
    Last_Point = %J2, %K2
    Formulation = %F
    Data_Specification = 0
    DATA_FILE {
        File_name = file("level.xol0")
        Item_Count = 1
        Item_Numbers = 1
    }
}
)";
    auto boundary = [&](int j1, int k1, int j2, int k2, int formulation) {
        std::string b = level;
        auto put = [&](const std::string& key, int value) { b.replace(b.find(key), key.size(), std::to_string(value)); };
        put("%J1", j1), put("%K1", k1), put("%J2", j2), put("%K2", k2), put("%F", formulation);
        return b;
    };
    bwtest::WriteSeriesFile(dir / "level.xol0", "2004-01-01 00:00:00", 0.1,
                            {std::vector<float>(20, 0.0f)});
    const std::vector<Case> cases = {
        // A point so shallow that it counts as water but is below the least depth.
        {[&](std::vector<float>& b) { b[at(4, 4)] = -0.00005f; }, "", "Negative water depth, near (4,4)"},
        // Water up to the east edge of the grid with no boundary there.
        {[&](std::vector<float>& b) { b[at(10, 5)] = -1.0f; }, "",
         "Undetected open east or north boundary point, near (10,5)"},
        // A west flux boundary on a row of one water point.
        {[&](std::vector<float>& b) {
             for (int k = 1; k <= 9; ++k) b[at(0, k)] = -1.0f;
             b[at(1, 5)] = 1.0f;
         },
         boundary(0, 1, 0, 9, 1), "One point wide open flux boundary, near (0,5)"},
    };
    for (const Case& c : cases) {
        WriteBasin(c.bed);
        std::map<std::string, std::string> sections = {{"Output_Deterministic_2D", kSurfaceOutput}};
        if (!c.boundaries.empty()) sections["Boundary_Location"] = c.boundaries;
        RunResult r = Run(ModelText("bed.xol2", sections));
        EXPECT_EQ(r.exitCode, 255) << c.text << "\n" << r.out;
        const std::string log = Log();
        EXPECT_NE(log.find("---------- B L O W  -  U P  detected ---\n" + c.text + "\n\nCOMPUTATION ENDED"),
                  std::string::npos)
            << c.text << "\n" << log.substr(log.size() > 3000 ? log.size() - 3000 : 0);
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
    std::string text = ModelText(
        "bed.xol2", {{"Simulation_Period", "Time_step_count = 1000000\nTime_step_interval = 0.05\n"
                                            "Start_time = 2004, 1, 1, 0, 0, 0\n"},
                     {"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0.01\n"},
                     {"Output_Deterministic_2D", kSurfaceOutput}});
    bwtest::WriteFile(dir / "m.bw", text);
    std::thread killer([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(1500));
        bwtest::WriteFile(dir / "m._kill_", "");
    });
    RunResult r = RunProgram({bw, "m.bw"}, dir.path.string(), {}, {"BUILDMODE", "TRF", "TARN_PROGRESS"});
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
