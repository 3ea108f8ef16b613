// Runs of 1DH models from end to end: the engine reads the model file,
// writes the mesh solver's file and runs the mesh solver on it. A closed
// basin stays at rest and ends normally with its run statistics; flux
// boundaries fill it with exactly the water they let in; dry land without a
// slot ends the run on a negative depth; bed resistance and porosity come
// from the model; a cancel ends the loop. The output of such runs read back
// and held against the model's state: point series, lines, the statistics
// along a flume against those computed off-line from its stored series, the
// closing block of a run that blows up, and the runup on a hand-made
// profile; and the records of a model file that stop the run.
#include "meshsolver/run_mesh_solver.hpp"

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "equations_flume.hpp"
#include "meshsolver/output_bw.hpp"
#include "meshsolver/statistics_bw.hpp"
#include "run/progress.hpp"
#include "support/log_capture.hpp"

namespace {

using namespace bwtest;
using MeshSolverRun = ProfileModel;
using OutputRun = ProfileModel;

const std::string kStepsLine = "Number of time steps                         ";
constexpr double kDt = 0.05;
constexpr float kNoStatistic = -1.0e-30f;
constexpr float kDelete = 1.0e-35f;  // the delete value of the mesh solver's files

// A basin closed at both ends by walls stays at rest; the log holds the
// solver's setup, the start and end of the computation, a line every 100
// steps and the statistics of the steps computed.
TEST_F(MeshSolverRun, ClosedBasinRunsToTheEndWithItsStatistics) {
    const RunResult r = Run({{"Simulation_Period", Period(250, 0.05)}});
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
        EXPECT_NEAR(SurfaceVolume(gBwModel), 2.0 * q * (t - ramp / 2.0), 0.01 * 2.0 * q * t);
        EXPECT_GT(gBwModel.Elevation[kJ / 2 + 1], 0.001);
        EXPECT_NEAR(gBwModel.Flux[1], q, 1e-9);
        EXPECT_NEAR(gBwModel.Flux[2 * kJ + 1], -q, 1e-9);
    }
    model["OPTION_PARAMETERS"] = "DAES_method = 3\n";
    const RunResult r = Run(model);
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_NE(r.out.find("SetupDaes: wrong time integration method"), std::string::npos) << r.out;
}

// A beach whose upper part is dry land stops before its first step without
// a slot; with the slot the dry nodes are wet in it and the run goes to its end.
TEST_F(MeshSolverRun, NegativeDepthEndsTheRunUnlessTheSlotHoldsIt) {
    std::vector<float> beach(kJ + 1);
    for (int j = 0; j <= kJ; ++j) beach[j] = -2.0f + 0.125f * static_cast<float>(j);  // to +0.5
    Bed(beach);
    Flux(0.05f);
    Sections model = {{"Simulation_Period", Period(150, 0.05, 40)},
                      {"Boundary_Location", FluxAtBothEnds("q.xol0")}};
    RunResult r = Run(model);
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_NE(r.out.find("Negative water depth detected"), std::string::npos) << r.out;
    EXPECT_NE(Log().find("BLOW-UP - Negative water depth"), std::string::npos);

    model["MOVING_SHORELINE"] =
        "type = 1\ndepth = -5\nwidth = 0.01\nsmoothing_parameter = 5\nfriction_coefficient = "
        "0.01\n";
    r = Run(model);
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    const std::string log = Log();
    EXPECT_EQ(log.find("BLOW-UP"), std::string::npos) << log;
    EXPECT_NE(log.find(kStepsLine + "150"), std::string::npos);
    EXPECT_NE(log.find("Min depth                  : -0.375"), std::string::npos) << log;
}

// What the mesh solver tells before a run that goes on: a slot whose water
// on the dry beach would carry waves beyond its step, a generation node in
// a sponge layer. And the end of the statistics that the model gives holds
// (the model reader writes its key with a capital).
TEST_F(MeshSolverRun, WarningsBeforeTheRunAndTheEndOfTheStatistics) {
    std::vector<float> beach(kJ + 1);
    for (int j = 0; j <= kJ; ++j) beach[j] = -2.0f + 0.125f * static_cast<float>(j);  // to +0.5
    Bed(beach);
    const std::string slot = "type = 1\ndepth = -5\nwidth = 0.01\nsmoothing_parameter = 5\n";
    // sqrt(9.81 x 5) = 7.0 m/s; 7.0 x 0.5 s / 2.5 m = 1.40. bw -check sets
    // the mesh solver up too and tells it.
    RunResult r = Run({{"Simulation_Period", Period(1, 0.5)}, {"MOVING_SHORELINE", slot}}, true);
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_NE(r.out.find("Warning: SpecSlotBW: the slot water of the dry points carries waves "
                         "at 7 m/s, a Courant number of 1.40"),
              std::string::npos)
        << r.out;
    r = Run({{"Simulation_Period", Period(1, 0.05)}, {"MOVING_SHORELINE", slot}});
    EXPECT_EQ(r.out.find("SpecSlotBW"), std::string::npos) << r.out;

    Bed(std::vector<float>(kJ + 1, -2.0f));
    std::vector<float> sponge(kJ + 1, 1.0f);
    sponge[0] = sponge[1] = sponge[2] = sponge[3] = 2.0f;
    WriteProfile(dir / "sponge.xol1", kDx, sponge);
    WriteSeriesFile(dir / "gen.xol0", "2004-01-01 00:00:00", 1.0,
                    {std::vector<float>(12, 0.0f), std::vector<float>(12, 0.0f)});
    const Sections generation = {
        {"Simulation_Period", Period(5, 0.05)},
        {"Sponge", "Sponge_Type = true\n" + DataFileSection("sponge.xol1")},
        {"Internal_Generation",
         "Number_Of_Records = 1\n" + GenerationRecord(1, 3, 0, 3, 0, 0, "gen.xol0")},
        {"OUTPUT_STATISTIC_1D", "Number_Of_Records = 0\nLast_Time_Step = 3\n"}};
    r = Run(generation);
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    // Node 3 is grid point 2, at 5 m.
    EXPECT_NE(r.out.find("Warning: SetupBoundCondBW: the generation node at x = 5 m lies in the "
                         "sponge layer (coefficient 2)"),
              std::string::npos)
        << r.out;
    std::string out;
    ASSERT_EQ(RunInProcess(generation, out), 0) << out;
    EXPECT_EQ(gWaveStatisticBW.last_time_step, 3);
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
    WriteLineFile(dir / "maps.xol1", "2004-01-01 00:00:00", 1.0, kDx, {{porosity}, {chezy}});
    model["Porosity"] = "Porosity_Type = true\n" + DataFileSection("maps.xol1", 1);
    model["Bottom_Friction"] =
        "Resistance_Type = 2\nFormulation = 1\n" + DataFileSection("maps.xol1", 2);
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
        WriteFile(dir / "m._kill_", "");
    });
    const RunResult r = Run({{"Simulation_Period", Period(100000000, 0.05)}}, false, true);
    killer.join();
    EXPECT_EQ(r.exitCode, 255) << r.out << r.err;
    const std::string log = Log();
    EXPECT_NE(log.find("Run is cancelled by the user"), std::string::npos) << log;
    EXPECT_LT(log.find("COMPUTATION ENDED"), log.find("Run Statistics"));
    EXPECT_EQ(log.find(kStepsLine + "100000000"), std::string::npos);
    EXPECT_NE(log.find("Abnormal completion"), std::string::npos);
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

// A still flume, 10 steps: every block of the point file holds the still
// state at the gauges, the line at places between the nodes too; the runup of a profile under water
// has no crossing. The files are closed and summarised after the computation.
TEST_F(OutputRun, StillFlumeFilesHoldTheState) {
    const Sections model = {
        {"Simulation_Period", Period(10, kDt)},
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
    ASSERT_EQ(RunInProcess(model, out), 0) << out;

    const DataFile gauges = Read("gauges.xol0");
    ASSERT_EQ(gauges.header.noDynamicItems, 15);  // 5 items at 3 points, item by item
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

    const DataFile line = Read("line.xol1");
    EXPECT_EQ(line.header.title, "Along");
    EXPECT_EQ(line.header.axes[0].count, 41);
    EXPECT_EQ(line.header.axes[0].spacing, 1.25f);
    EXPECT_EQ(line.header.axes[0].origin, 0.0f);
    EXPECT_EQ(line.header.misc[3], 10.0f) << "the land value";
    EXPECT_EQ(line.header.startDateTime, "2004-01-01 00:00:00");  // 2 x 0.05 s: a fraction
    EXPECT_NEAR(line.header.startOffset, 0.1, 1e-9);
    EXPECT_NEAR(line.header.timeStep, 4 * kDt, 1e-12);
    ASSERT_EQ(line.records.size(), 3u);  // steps 2, 6, 10
    for (const auto& block : line.records)
        for (int p = 0; p < 41; ++p) {
            EXPECT_EQ(block[0][p], 0.0f) << p;
            EXPECT_EQ(block[1][p], -2.0f) << p;
        }

    const DataFile shore = Read("shore.xol0");
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
    WriteSeriesFile(dir / "q.xol0", "2004-01-01 00:00:00", kDt,
                    {RampedSine(0.05, 2.0, kDt, steps + 2, 1.0)});
    const Sections model = {
        {"Simulation_Period", Period(steps, kDt)},
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

    const DataFile gauges = Read("gauges.xol0");
    const DataFile stat = Read("stat.xol1");
    ASSERT_EQ(gauges.records.size(), static_cast<size_t>(steps + 1));
    ASSERT_EQ(stat.records.size(), 3u);  // steps 0, 120, 240
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

    const DataFile surface = Read("surface.xol1");
    ASSERT_EQ(surface.records.size(), 2u);
    for (int j = 0; j <= kJ; ++j)
        EXPECT_FLOAT_EQ(surface.records[1][0][j], static_cast<float>(gBwModel.Elevation[j + 1]));
    EXPECT_EQ(surface.records[1][1][0], surface.records[1][2][0]);
    EXPECT_EQ(surface.records[1][1][kJ], surface.records[1][2][kJ]);
    EXPECT_NE(surface.records[1][1][0], 0.0f);
}

// A flux that empties a shallow basin dries it and ends the run as a
// blow-up, reported before the computation ends with its statistics: every
// file gets the closing block behind the last step done and is closed
// readable; the closing block of the statistics has no valid node, the
// filtered surface stays a number.
TEST_F(OutputRun, BlowUpWritesTheClosingBlock) {
    Bed(std::vector<float>(kJ + 1, -1.0f));
    Flux(-5.0f);
    const Sections model = {
        {"Simulation_Period", Period(200, kDt)},
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
    EXPECT_LT(out.find("BLOW-UP - Negative water depth"), out.find("COMPUTATION ENDED")) << out;
    EXPECT_LT(out.find("COMPUTATION ENDED"), out.find("Output Statistics"));
    EXPECT_LT(out.find("Output Statistics"), out.find("Run Statistics"));
    EXPECT_EQ(out.find(kStepsLine + "200"), std::string::npos);

    const DataFile surface = Read("surface.xol1");
    ASSERT_EQ(surface.records.size(), static_cast<size_t>(k + 1));  // 0..k-1 and the closing one
    for (int j = 0; j <= kJ; ++j)
        EXPECT_FLOAT_EQ(surface.records[k][0][j], static_cast<float>(gBwModel.Elevation[j + 1]));
    const DataFile stat = Read("stat.xol1");
    ASSERT_EQ(stat.records.size(), static_cast<size_t>(k + 1));
    EXPECT_LT(stat.records[k - 1][0][0], 0.0f) << "the mean falls while the basin empties";
    for (int j = 0; j <= kJ; ++j) {
        EXPECT_EQ(stat.records[k][0][j], kNoStatistic);
        EXPECT_EQ(stat.records[k][1][j], kNoStatistic);
        EXPECT_TRUE(std::isfinite(stat.records[k][2][j]));
        EXPECT_NE(stat.records[k][2][j], kNoStatistic);
    }
}

// The messages of the 1DH output sections that a model file can reach: from
// the engine's reading, before the solver file is written, and from the
// mesh solver's setup (a file not of its kind, a line that runs backwards,
// an item beyond the table of its kind).
TEST_F(OutputRun, ModelFilesThatStopWithTheirMessage) {
    const std::string det = "OUTPUT_DETERMINISTIC_1D", stat = "OUTPUT_STATISTIC_1D",
                      shore = "OUTPUT_MOVING_SHORELINE_1D", on = "INCLUDE_CALCULATION = true\n";
    const struct {
        std::string section, body, message;
    } cases[] = {
        {det, One("File_Name = file(\"out.txt\")\n"), "SetupOutputInfo1D: Wrong file extension"},
        {shore, on + Record(1, "File_Name = file(\"shore.xol3\")\n"),
         "SetupOutputInfo1D: Wrong file extension"},
        {det, One(Places("g.xol0", "3, 21", 2)),
         "SetupOutputInfo1D: a point of X_Range_And_Interval of record 1 is 21 and lies outside "
         "the grid (0..20)"},
        {det, One(Places("g.xol0", "3, 4", 3)),
         "SetupOutputInfo1D: X_Range_And_Interval of record 1 holds 2 values where 3 are needed"},
        {stat, "-", "KVT section: OUTPUT_STATISTIC_1D not found"},
        {det, "Number_Of_Records = 2\n" + Record(1, "File_Name = file(\"a.xol0\")\n"),
         "KVT section: OUTPUT_SPEC_DATA_2 not found"},
        {det, One(Places("gauges.dt0", "4", 1) + Span(0, 5, 1, "3")),
         "SetupPointDomain: Wrong file type"},
        {det, One(Places("line.dt1", "0, 20", 21) + Span(0, 5, 1, "3")),
         "SetupAreaDomain: Wrong file type"},
        {det, One(Places("line.xol1", "20, 0", 21) + Span(0, 5, 1, "3")),
         "SetupAreaDomain: Grid spacing must be larger than zero"},
        {stat, One(Places("stat.xol1", "0, 20", 21) + Span(0, 5, 1, "20")),
         "SpecPhaseAverageBW: Item type not supported"},
        {det, One(Places("line.xol1", "0, 20", 21) + Span(0, 5, 1, "3, 15")),
         "SpecStandardBW: Item type not supported"},
        {shore, on + Record(1, "File_Name = file(\"r.xol0\")\nNumber_Of_Items = 4\n"),
         "SpecRunupBW: Item type not supported"},
    };
    for (const auto& c : cases) {
        std::filesystem::remove(dir / "m.bw_FEM.kvt");
        const RunResult r = Run({{"Simulation_Period", Period(5, kDt)}, {c.section, c.body}});
        EXPECT_EQ(r.exitCode, 1) << c.message;
        EXPECT_NE(r.out.find(c.message), std::string::npos) << r.out << r.err;
        // The engine's own checks stop it before it writes the solver file.
        const bool engine =
            c.message.starts_with("SetupOutputInfo1D") || c.message.starts_with("KVT");
        EXPECT_EQ(std::filesystem::exists(dir / "m.bw_FEM.kvt"), !engine) << c.message;
    }
}

// The runup on a hand-made beach from -2 m to +2 m (nodes at x = 0, 2, .., 8):
// the water line lies where eta + d changes sign, at the bed level there;
// the first crossing of the run is the reference of the total runup, which
// is negative below it. With all nodes wet, or all dry, all three values
// are the delete value and the reference stays unset. The k-th item takes
// the k-th value, whatever its number.
TEST(OutputRunup, WaterLineOnABeach) {
    TempDir dir;
    LogCapture log;
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

    const DataFile runup = ReadDataFile(dir / "runup.xol0");
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
