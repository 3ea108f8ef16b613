// Runs of 1DH models from end to end: the engine reads the model file,
// writes the mesh solver's file and runs the mesh solver on it. A closed
// basin stays at rest and ends normally with its run statistics; flux
// boundaries fill it with exactly the water they let in; a boundary that
// draws the water out dries a node and ends the run as a blow-up.
#include "meshsolver/run_mesh_solver.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <filesystem>
#include <functional>
#include <sstream>

#include "input/kvt_access.hpp"
#include "mesh/mesh.hpp"
#include "meshsolver/bw_model.hpp"
#include "run/messages.hpp"
#include "run/progress.hpp"
#include "run/timing.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;

constexpr int kJ = 20;       // points 0..20: nodes 1..21
constexpr float kDx = 2.5f;  // spacing of the line

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

    // A line of kJ + 1 points with the bed at `bed` below the datum.
    void SetUp() override { Bed(-2.0f); }
    void Bed(float level) {
        std::vector<float> bed(kJ + 1, level);
        bwtest::WriteLineFile(dir / "line.xol1", "2004-01-01 00:00:00", 1.0, kDx, {{bed}});
    }
    // A constant flux Q into the basin at both ends, from a series that
    // covers the run.
    void Flux(float q, double seconds) {
        const int records = static_cast<int>(seconds) + 2;
        bwtest::WriteSeriesFile(dir / "q.xol0", "2004-01-01 00:00:00", 1.0,
                                {std::vector<float>(records, q)});
    }
    static Sections Model(Sections given) { return bwtest::ProfileSections(std::move(given)); }
    bwtest::RunResult Run(const Sections& given, bool check = false) {
        bwtest::WriteFile(dir / "m.bw", bwtest::ModelText("line.xol1", Model(given)));
        std::vector<std::string> argv = {bwtest::BuiltProgram("bw")};
        if (check) argv.push_back("-check");
        argv.push_back("m.bw");
        return bwtest::RunProgram(argv, dir.path.string(),
                                  {{"TARN_PROGRESS", "NONE"}, {"OMP_NUM_THREADS", "1"}},
                                  {"BUILDMODE", "TRF"});
    }
    std::string Log() const { return bwtest::ReadFile(dir / "m.log"); }

    // Runs the mesh solver in this process on the solver file that the
    // engine wrote for the model, after edit has had its say on the text;
    // the log goes to standard output, returned in out.
    int32_t RunInProcess(const Sections& model, std::string& out,
                         const std::function<void(std::string&)>& edit = {}) {
        EXPECT_EQ(Run(model, true).exitCode, 0);
        std::string fem = bwtest::ReadFile(dir / "m.bw_FEM.kvt");
        if (edit) edit(fem);
        bwtest::WriteFile(dir / "m.bw_FEM.kvt", fem);
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
    std::string logName;
};

size_t Count(const std::string& text, const std::string& part) {
    size_t n = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) ++n;
    return n;
}

// A basin closed at both ends by walls stays at rest; the log holds the
// solver's setup, the start and end of the computation, a line every 100
// steps and the statistics of the steps computed.
TEST_F(MeshSolverRun, ClosedBasinRunsToTheEndWithItsStatistics) {
    const bwtest::RunResult r = Run({{"Simulation_Period", Period(250, 0.05)}});
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
    const std::string log = Log();
    EXPECT_NE(log.find("MeshSolverBW"), std::string::npos) << "the solver file echoes in the log";
    for (const char* line : {"Simulation information", "Min depth                  : 2",
                             "Max depth                  : 2", "Min length                 : 2.5",
                             "COMPUTATION STARTED", "COMPUTATION ENDED", "Run Statistics",
                             "Number of time steps                         250",
                             "Short Wave Simulation", "Successful completion"})
        EXPECT_NE(log.find(line), std::string::npos) << line << "\n" << log;
    // sqrt(9.81 x 2) / 2.5 x 0.05
    EXPECT_NE(log.find("Max Courant number         : 0.0885"), std::string::npos) << log;
    EXPECT_EQ(Count(log, " Timestep: "), 2u);
    EXPECT_NE(log.find(" Timestep:        100\n"), std::string::npos);
    EXPECT_NE(log.find(" Timestep:        200\n"), std::string::npos);
    EXPECT_LT(log.find("COMPUTATION STARTED"), log.find(" Timestep:        100"));
    EXPECT_LT(log.find("COMPUTATION ENDED"), log.find("Run Statistics"));
    EXPECT_EQ(log.find("BLOW-UP"), std::string::npos);
    // The log is the model's, beside it, whatever the solver file is called.
    EXPECT_FALSE(std::filesystem::exists(dir / "m.bw_FEM.log"));
}

// 99 steps: no step line. No step at all (a solver file of 0 steps, which
// the model reader never writes): the loop body never runs.
TEST_F(MeshSolverRun, ShortRunsWriteNoStepLine) {
    const bwtest::RunResult r = Run({{"Simulation_Period", Period(99, 0.05)}});
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
    std::string log = Log();
    EXPECT_EQ(log.find(" Timestep: "), std::string::npos);
    EXPECT_NE(log.find("Number of time steps                         99\n"), std::string::npos)
        << log;
    EXPECT_NE(log.find("Successful completion"), std::string::npos);

    const int32_t status = RunInProcess({}, log, [](std::string& fem) {
        const size_t at = fem.find("number_of_time_steps = ");
        ASSERT_NE(at, std::string::npos);
        fem.replace(at, fem.find('\n', at) - at, "number_of_time_steps = 0");
    });
    EXPECT_EQ(status, 0);
    EXPECT_EQ(gMeshRun.StepCounter, 0);
    EXPECT_NE(log.find("Number of time steps                         0\n"), std::string::npos)
        << log;
    EXPECT_LT(log.find("COMPUTATION STARTED"), log.find("COMPUTATION ENDED"));
}

// A flux that empties a shallow basin at both ends dries the end nodes: the
// blow-up is reported with the node, the run still ends in order with its
// statistics, and the exit code is -1.
TEST_F(MeshSolverRun, DryingBoundaryEndsAsBlowUp) {
    Bed(-1.0f);
    Flux(-5.0f, 10.0);
    const bwtest::RunResult r = Run({{"Simulation_Period", Period(200, 0.05)},
                                     {"Boundary_Location", FluxAtBothEnds("q.xol0")}});
    EXPECT_EQ(r.exitCode, 255) << r.out << r.err;  // -1
    const std::string log = Log();
    EXPECT_NE(log.find("--------------- BLOW-UP - Negative water depth -----------------\n"
                       " node number                             : "),
              std::string::npos)
        << log;
    EXPECT_NE(log.find(" still water depth (d)                   :           0.1000E+01\n" +
                       std::string(64, '-') + "\n"),
              std::string::npos)
        << log;
    EXPECT_LT(log.find("BLOW-UP"), log.find("COMPUTATION ENDED"));
    EXPECT_NE(log.find("Run Statistics"), std::string::npos);
    EXPECT_EQ(log.find("Number of time steps                         200"), std::string::npos);
    EXPECT_NE(log.find("Abnormal completion"), std::string::npos);
}

// A switched-on process that the mesh solver does not carry out yet stops
// the run once its settings are read.
TEST_F(MeshSolverRun, ProcessesStillToComeStopAfterReading) {
    const bwtest::RunResult r = Run({{"WAVE_BREAKING", "type = 1\n"}});
    EXPECT_EQ(r.exitCode, 1) << r.out << r.err;
    EXPECT_EQ(r.out, "The 1DH mesh solver is not yet available in this version\n");
    const std::string log = Log();
    EXPECT_NE(log.find("half_time"), std::string::npos) << log;
    EXPECT_NE(log.find("EXPLICIT_FILTERING"), std::string::npos) << "read to the end";
    EXPECT_EQ(log.find("COMPUTATION STARTED"), std::string::npos);
}

// A beach whose upper part is dry land: without a slot the start state has
// a negative depth and the run stops before its first step; with the slot
// the dry nodes are wet in the slot and the run goes to its end.
TEST_F(MeshSolverRun, DryLandNeedsTheSlot) {
    std::vector<float> bed(kJ + 1);
    for (int j = 0; j <= kJ; ++j) bed[j] = -2.0f + 0.125f * static_cast<float>(j);  // up to +0.5
    bwtest::WriteLineFile(dir / "line.xol1", "2004-01-01 00:00:00", 1.0, kDx, {{bed}});
    Flux(0.05f, 10.0);
    const Sections waves = {{"Simulation_Period", Period(150, 0.05, 40)},
                            {"Boundary_Location", FluxAtBothEnds("q.xol0")}};
    bwtest::RunResult r = Run(waves);
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_NE(r.out.find("Negative water depth detected"), std::string::npos) << r.out;
    EXPECT_NE(Log().find("BLOW-UP - Negative water depth"), std::string::npos);

    Sections slot = waves;
    slot["MOVING_SHORELINE"] =
        "type = 1\ndepth = -5\nwidth = 0.01\nsmoothing_parameter = 5\n"
        "friction_coefficient = 0.01\n";
    r = Run(slot);
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    const std::string log = Log();
    EXPECT_EQ(log.find("BLOW-UP"), std::string::npos) << log;
    EXPECT_NE(log.find("Number of time steps                         150"), std::string::npos);
    EXPECT_NE(log.find("Min depth                  : -0.375"), std::string::npos) << log;
}

// Bed resistance by Chezy: r = g / C^2 on every node, and a flow that the
// resistance holds back: the same inflow needs a steeper surface, higher at
// the inlet.
TEST_F(MeshSolverRun, ChezyResistanceSlowsTheFlow) {
    const double dt = 0.05, q = 0.05;
    const int steps = 200;
    Flux(static_cast<float>(q), steps * dt);
    Sections model = {{"Simulation_Period", Period(steps, dt, 20)},
                      {"Boundary_Location", FluxAtBothEnds("q.xol0")}};
    std::string out;
    ASSERT_EQ(RunInProcess(model, out), 0) << out;
    const double inletFree = gBwModel.Elevation[1];
    model["Bottom_Friction"] = "Resistance_Type = 1\nFormulation = 1\nConstant_Value = 1.5\n";
    ASSERT_EQ(RunInProcess(model, out), 0) << out;
    EXPECT_EQ(gBwModel.resistanceType, 2);
    EXPECT_NEAR(gBwModel.Resistance[1], 9.81 / 2.25, 1e-12);
    EXPECT_NEAR(gBwModel.Resistance[kJ + 1], 9.81 / 2.25, 1e-12);
    EXPECT_GT(inletFree, 0.0);
    EXPECT_GT(gBwModel.Elevation[1], 1.1 * inletFree);
}

// Maps on the line: a porosity layer with the solver's own particle
// coefficients (alpha = 1000 x 1.4e-6 / 0.2^2, beta = 2.8 / 0.2) and a map
// of Chezy coefficients; the run goes to its end.
TEST_F(MeshSolverRun, PorosityAndResistanceMaps) {
    std::vector<float> porosity(kJ + 1, 0.5f), chezy(kJ + 1, 30.0f);
    porosity[kJ] = 1.0f;
    chezy[0] = 20.0f;
    bwtest::WriteLineFile(dir / "maps.xol1", "2004-01-01 00:00:00", 1.0, kDx,
                          {{porosity}, {chezy}});
    Flux(0.02f, 10.0);
    std::string out;
    const int32_t status = RunInProcess(
        {{"Simulation_Period", Period(100, 0.05, 20)},
         {"Boundary_Location", FluxAtBothEnds("q.xol0")},
         {"Porosity", "Porosity_Type = true\n" + bwtest::DataFileSection("maps.xol1", 1)},
         {"Bottom_Friction",
          "Resistance_Type = 2\nFormulation = 1\n" + bwtest::DataFileSection("maps.xol1", 2)}},
        out);
    ASSERT_EQ(status, 0) << out;
    EXPECT_EQ(gBwModel.Porosity[1], 0.5);
    EXPECT_EQ(gBwModel.Porosity[kJ + 1], 1.0);
    EXPECT_NEAR(gBwModel.porosityAlpha, 0.035, 1e-12);
    EXPECT_NEAR(gBwModel.porosityBeta, 14.0, 1e-12);
    EXPECT_NEAR(gBwModel.Resistance[1], 9.81 / 400.0, 1e-12);
    EXPECT_NEAR(gBwModel.Resistance[2], 9.81 / 900.0, 1e-12);
    EXPECT_GT(gBwModel.Elevation[kJ / 2 + 1], 0.0);
}

// In process: the mesh solver's file of a model with a flux Q into both
// ends, ramped up over the soft start interval T, is run directly. The water
// in the basin is what came in: 2 Q (t - T / 2) for a sine ramp, and the
// waves have reached the middle.
TEST_F(MeshSolverRun, FluxBoundariesFillTheBasinWithWhatTheyLetIn) {
    const double dt = 0.05, q = 0.02;
    const int steps = 200, warmUp = 40;
    Flux(static_cast<float>(q), steps * dt);
    std::string out;
    const int32_t status = RunInProcess({{"Simulation_Period", Period(steps, dt, warmUp)},
                                         {"Boundary_Location", FluxAtBothEnds("q.xol0")}},
                                        out);
    ASSERT_EQ(status, 0) << out;
    EXPECT_EQ(logName, "m.log");
    EXPECT_EQ(gMeshRun.StepCounter, steps);
    EXPECT_EQ(gMeshRun.CurrentStep, steps + 1);

    const Mesh& line = gMeshes.meshes[gBwModel.ElevationMesh];
    double volume = 0.0;
    for (int32_t e = 1; e <= line.ElementCount; ++e)
        volume += line.ElementLength[e] *
                  (gBwModel.Elevation[GetElementNode(line, e, 1)] +
                   gBwModel.Elevation[GetElementNode(line, e, 2)]) /
                  2.0;
    const double t = steps * dt, ramp = warmUp * dt;
    EXPECT_NEAR(volume, 2.0 * q * (t - ramp / 2.0), 0.01 * 2.0 * q * t);
    // The fronts have met in the middle, 25 m from either end, after 10 s.
    EXPECT_GT(gBwModel.Elevation[kJ / 2 + 1], 0.001);
    EXPECT_NEAR(gBwModel.Flux[1], q, 1e-9);
    EXPECT_NEAR(gBwModel.Flux[2 * kJ + 1], -q, 1e-9);
}

// A cancel that is pending when the loop starts: the driver returns at
// once, with no statistics, and the run keeps its own name.
TEST_F(MeshSolverRun, CancelBeforeTheFirstStepReturnsAtOnce) {
    std::string out;
    gProgress.cancelSeen = true;
    const int32_t status = RunInProcess({{"Simulation_Period", Period(10, 0.05)}}, out);
    gProgress.cancelSeen = false;
    EXPECT_EQ(status, -1);
    EXPECT_EQ(logName, "m.bw");
    EXPECT_EQ(gMeshRun.StepCounter, 0);
    EXPECT_NE(out.find("COMPUTATION STARTED"), std::string::npos);
    EXPECT_NE(out.find("Run is cancelled by the user"), std::string::npos) << out;
    EXPECT_EQ(out.find("COMPUTATION ENDED"), std::string::npos);
    EXPECT_EQ(out.find("Run Statistics"), std::string::npos);
}

TEST(MeshSolverLogName, LaterOfTheTwoExtensions) {
    EXPECT_EQ(MeshSolverLogName("m.bw_FEM.kvt"), "m.log");
    EXPECT_EQ(MeshSolverLogName("/a.bw/run.BW_FEM.kvt"), "/a.bw/run.log");
    EXPECT_EQ(MeshSolverLogName("run.BW.bw_FEM.kvt"), "run.BW.log");
    EXPECT_EQ(MeshSolverLogName("model.kvt_FEM.kvt"), "model.kvt_FEM.kvt");
}

}  // namespace
