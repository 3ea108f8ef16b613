// Runs of 1DH models from end to end: the engine reads the model file,
// writes the mesh solver's file and runs the mesh solver on it. A closed
// basin stays at rest and ends normally with its run statistics; flux
// boundaries fill it with exactly the water they let in; water drawn out or
// dry land without a slot end the run on a negative depth; bed resistance
// and porosity come from the model; a cancel ends the loop.
#include "meshsolver/run_mesh_solver.hpp"

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <sstream>
#include <thread>

#include "equations_flume.hpp"
#include "run/progress.hpp"
#include "run/timing.hpp"
#include "support/model_builder.hpp"

namespace {

using Sections = std::map<std::string, std::string>;

constexpr int kJ = 20;       // points 0..20: nodes 1..21
constexpr float kDx = 2.5f;  // spacing of the line
const std::string kStepsLine = "Number of time steps                         ";

std::string Period(int steps, double dt, int warmUp = 0) {
    std::ostringstream s;
    s << "Time_step_count = " << steps << "\nTime_step_interval = " << dt
      << "\nWarm_up_period = " << warmUp << "\nStart_time = 2004, 1, 1, 0, 0, 0\n";
    return s.str();
}

// A boundary record at the first point: a flux series (Formulation 1) that
// the translation gives to code 2, the code of both ends of the line.
std::string FluxAtBothEnds(const std::string& file) {
    return "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = 0, 0\nLast_Point = 0, 0\n"
           "Formulation = 1\nData_Specification = 0\nDATA_FILE {\nFile_name = file(\"" +
           file + "\")\nItem_Count = 1\nItem_Numbers = 1\n}\n}\n";
}

class MeshSolverRun : public testing::Test {
protected:
    bwtest::TempDir dir;
    std::string logName;

    void SetUp() override { Bed(std::vector<float>(kJ + 1, -2.0f)); }
    void Bed(const std::vector<float>& bed) {
        bwtest::WriteLineFile(dir / "line.xol1", "2004-01-01 00:00:00", 1.0, kDx, {{bed}});
    }
    // A constant flux q into the basin at both ends for 10 s.
    void Flux(float q) {
        bwtest::WriteSeriesFile(dir / "q.xol0", "2004-01-01 00:00:00", 1.0,
                                {std::vector<float>(12, q)});
    }
    bwtest::RunResult Run(const Sections& given, bool check = false, bool progress = false) {
        return bwtest::RunProfileModel(dir, given, check, "line.xol1", progress);
    }
    std::string Log() const { return bwtest::ReadFile(dir / "m.log"); }

    // Runs the mesh solver in this process on the solver file that the
    // engine wrote for the model; the log goes to standard output, returned
    // in out.
    int32_t RunInProcess(const Sections& model, std::string& out) {
        EXPECT_EQ(Run(model, true).exitCode, 0);
        const std::filesystem::path cwd = std::filesystem::current_path();
        std::filesystem::current_path(dir.path);
        ResetMeshModel();
        ResetBwModel();
        InitTiming(gOverallTiming, "Overall", 4);
        for (int task = 1; task <= 4; ++task) AddTiming(gOverallTiming, task, "task");
        logName = "m.bw";
        int32_t status = 0;
        testing::internal::CaptureStdout();
        RunMeshSolver("m.bw_FEM.kvt", logName, status);
        out = testing::internal::GetCapturedStdout();
        std::filesystem::current_path(cwd);
        return status;
    }
};

// A basin closed at both ends by walls stays at rest; the log holds the
// solver's setup, the start and end of the computation, a line every 100
// steps and the statistics of the steps computed.
TEST_F(MeshSolverRun, ClosedBasinRunsToTheEndWithItsStatistics) {
    const bwtest::RunResult r = Run({{"Simulation_Period", Period(250, 0.05)}});
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
    const std::string log = Log();
    for (const std::string& line :
         {std::string("MeshSolverBW"), std::string("Min depth                  : 2"),
          std::string("Max depth                  : 2"),
          std::string("Min length                 : 2.5"),
          std::string("Max Courant number         : 0.0885"),  // sqrt(9.81 x 2) / 2.5 x 0.05
          kStepsLine + "250", std::string("Short Wave Simulation"),
          std::string("Successful completion")})
        EXPECT_NE(log.find(line), std::string::npos) << line << "\n" << log;
    EXPECT_LT(log.find("COMPUTATION STARTED"), log.find(" Timestep:        100\n"));
    EXPECT_LT(log.find(" Timestep:        100\n"), log.find(" Timestep:        200\n"));
    EXPECT_LT(log.find(" Timestep:        200\n"), log.find("COMPUTATION ENDED"));
    EXPECT_LT(log.find("COMPUTATION ENDED"), log.find("Run Statistics"));
    EXPECT_EQ(log.find(" Timestep:        300"), std::string::npos);
    EXPECT_EQ(log.find("BLOW-UP"), std::string::npos);
    // The log is the model's, beside it, whatever the solver file is called.
    EXPECT_FALSE(std::filesystem::exists(dir / "m.bw_FEM.log"));
}

// A flux Q into both ends, ramped up over the soft start interval T, with
// either integrator a model file can ask for: the water in the basin is
// what came in, 2 Q (t - T / 2) for a sine ramp, the boundary nodes carry Q
// inwards, and the fronts have met in the middle, 25 m from either end,
// after 10 s. A method the mesh solver does not know stops the run.
TEST_F(MeshSolverRun, FluxBoundariesFillTheBasinWithWhatTheyLetIn) {
    const double dt = 0.05, q = 0.02;
    const int steps = 200, warmUp = 40;
    Flux(static_cast<float>(q));
    Sections model = {{"Simulation_Period", Period(steps, dt, warmUp)},
                      {"Boundary_Location", FluxAtBothEnds("q.xol0")}};
    for (const char* method : {"1", "2"}) {
        SCOPED_TRACE(method);
        model["OPTION_PARAMETERS"] = std::string("DAES_method = ") + method + "\n";
        std::string out;
        ASSERT_EQ(RunInProcess(model, out), 0) << out;
        EXPECT_EQ(gBwModel.Dae.DaeMethod, method[0] - '0');
        EXPECT_EQ(logName, "m.log");
        EXPECT_EQ(gMeshRun.StepCounter, steps);
        const double t = steps * dt, ramp = warmUp * dt;
        EXPECT_NEAR(bwtest::SurfaceVolume(gBwModel), 2.0 * q * (t - ramp / 2.0),
                    0.01 * 2.0 * q * t);
        EXPECT_GT(gBwModel.Elevation[kJ / 2 + 1], 0.001);
        EXPECT_NEAR(gBwModel.Flux[1], q, 1e-9);
        EXPECT_NEAR(gBwModel.Flux[2 * kJ + 1], -q, 1e-9);
    }
    model["OPTION_PARAMETERS"] = "DAES_method = 3\n";
    const bwtest::RunResult r = Run(model);
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_NE(r.out.find("SetupDaes: wrong time integration method"), std::string::npos) << r.out;
}

// A flux that empties a shallow basin dries the end nodes: the blow-up is
// reported, the run still ends in order with its statistics and the exit
// code is -1. A beach whose upper part is dry land stops
// before its first step without a slot; with the slot the dry nodes are wet
// in it and the run goes to its end.
TEST_F(MeshSolverRun, NegativeDepthEndsTheRunUnlessTheSlotHoldsIt) {
    Bed(std::vector<float>(kJ + 1, -1.0f));
    Flux(-5.0f);
    bwtest::RunResult r = Run({{"Simulation_Period", Period(200, 0.05)},
                               {"Boundary_Location", FluxAtBothEnds("q.xol0")}});
    EXPECT_EQ(r.exitCode, 255) << r.out << r.err;
    std::string log = Log();
    EXPECT_LT(log.find("BLOW-UP - Negative water depth"), log.find("COMPUTATION ENDED")) << log;
    EXPECT_LT(log.find("COMPUTATION ENDED"), log.find("Run Statistics"));
    EXPECT_EQ(log.find(kStepsLine + "200"), std::string::npos);
    EXPECT_NE(log.find("Abnormal completion"), std::string::npos);

    std::vector<float> beach(kJ + 1);
    for (int j = 0; j <= kJ; ++j) beach[j] = -2.0f + 0.125f * static_cast<float>(j);  // to +0.5
    Bed(beach);
    Flux(0.05f);
    Sections model = {{"Simulation_Period", Period(150, 0.05, 40)},
                      {"Boundary_Location", FluxAtBothEnds("q.xol0")}};
    r = Run(model);
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_NE(r.out.find("Negative water depth detected"), std::string::npos) << r.out;
    EXPECT_NE(Log().find("BLOW-UP - Negative water depth"), std::string::npos);

    model["MOVING_SHORELINE"] =
        "type = 1\ndepth = -5\nwidth = 0.01\nsmoothing_parameter = 5\nfriction_coefficient = "
        "0.01\n";
    r = Run(model);
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    log = Log();
    EXPECT_EQ(log.find("BLOW-UP"), std::string::npos) << log;
    EXPECT_NE(log.find(kStepsLine + "150"), std::string::npos);
    EXPECT_NE(log.find("Min depth                  : -0.375"), std::string::npos) << log;
}

// Bed resistance by Chezy, r = g / C^2: a constant one holds the flow back,
// so that the same inflow needs a surface higher at the inlet; maps of Chezy
// numbers and porosity on the line, the layer with the solver's own particle
// coefficients (alpha = 1000 x 1.4e-6 / 0.2^2, beta = 2.8 / 0.2).
TEST_F(MeshSolverRun, BedResistanceAndPorosityFromTheModel) {
    Flux(0.05f);
    Sections model = {{"Simulation_Period", Period(200, 0.05, 20)},
                      {"Boundary_Location", FluxAtBothEnds("q.xol0")}};
    std::string out;
    ASSERT_EQ(RunInProcess(model, out), 0) << out;
    const double inletFree = gBwModel.Elevation[1];
    model["Bottom_Friction"] = "Resistance_Type = 1\nFormulation = 1\nConstant_Value = 1.5\n";
    ASSERT_EQ(RunInProcess(model, out), 0) << out;
    EXPECT_EQ(gBwModel.resistanceType, 2);
    EXPECT_GT(inletFree, 0.0);
    EXPECT_GT(gBwModel.Elevation[1], 1.1 * inletFree);

    std::vector<float> porosity(kJ + 1, 0.5f), chezy(kJ + 1, 30.0f);
    porosity[kJ] = 1.0f;
    chezy[0] = 20.0f;
    bwtest::WriteLineFile(dir / "maps.xol1", "2004-01-01 00:00:00", 1.0, kDx,
                          {{porosity}, {chezy}});
    model["Porosity"] = "Porosity_Type = true\n" + bwtest::DataFileSection("maps.xol1", 1);
    model["Bottom_Friction"] =
        "Resistance_Type = 2\nFormulation = 1\n" + bwtest::DataFileSection("maps.xol1", 2);
    ASSERT_EQ(RunInProcess(model, out), 0) << out;
    EXPECT_EQ(gBwModel.Porosity[1], 0.5);
    EXPECT_EQ(gBwModel.Porosity[kJ + 1], 1.0);
    EXPECT_NEAR(gBwModel.porosityAlpha, 0.035, 1e-12);
    EXPECT_NEAR(gBwModel.porosityBeta, 14.0, 1e-12);
    EXPECT_NEAR(gBwModel.Resistance[1], 9.81 / 400.0, 1e-12);
    EXPECT_NEAR(gBwModel.Resistance[2], 9.81 / 900.0, 1e-12);
}

// A cancel pending when the loop starts returns at once, with no
// statistics, and the run keeps its own name; a kill file written while the
// run goes on cancels it between two steps, and the run ends early with its
// statistics and an abnormal exit.
TEST_F(MeshSolverRun, ACancelEndsTheRun) {
    std::string out;
    gProgress.cancelSeen = true;
    const int32_t status = RunInProcess({{"Simulation_Period", Period(10, 0.05)}}, out);
    gProgress.cancelSeen = false;
    EXPECT_EQ(status, -1);
    EXPECT_EQ(logName, "m.bw");
    EXPECT_EQ(gMeshRun.StepCounter, 0);
    EXPECT_LT(out.find("COMPUTATION STARTED"), out.find("Run is cancelled by the user"));
    EXPECT_EQ(out.find("COMPUTATION ENDED"), std::string::npos);
    EXPECT_EQ(out.find("Run Statistics"), std::string::npos);

    std::thread killer([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(1000));
        bwtest::WriteFile(dir / "m._kill_", "");
    });
    const bwtest::RunResult r = Run({{"Simulation_Period", Period(100000000, 0.05)}}, false, true);
    killer.join();
    EXPECT_EQ(r.exitCode, 255) << r.out << r.err;
    const std::string log = Log();
    EXPECT_NE(log.find("Run is cancelled by the user"), std::string::npos) << log;
    EXPECT_LT(log.find("COMPUTATION ENDED"), log.find("Run Statistics"));
    EXPECT_EQ(log.find(kStepsLine + "100000000"), std::string::npos);
}

// A solver file that is not there stops the mesh solver with its name.
TEST(MeshSolverDeathTest, AMissingSolverFileStops) {
    setenv("TRF", "HUD", 1);  // the stop text to standard error
    std::string name;
    int32_t status = 0;
    EXPECT_EXIT(RunMeshSolver("absent.bw_FEM.kvt", name, status), testing::ExitedWithCode(1),
                "Unable to open absent.bw_FEM.kvt");
    unsetenv("TRF");
}

TEST(MeshSolverLogName, LaterOfTheTwoExtensions) {
    EXPECT_EQ(MeshSolverLogName("/a.bw/run.BW_FEM.kvt"), "/a.bw/run.log");
    EXPECT_EQ(MeshSolverLogName("run.BW.bw_FEM.kvt"), "run.BW.log");
    EXPECT_EQ(MeshSolverLogName("model.kvt_FEM.kvt"), "model.kvt_FEM.kvt");
}

}  // namespace
