// The driver of the mesh solver: the solver file written by the model
// reader is opened, the time axis, the meshes and the Boussinesq module are
// set up from it, and the loop advances the state one call of the
// integrator a step, with output after each step, progress, cancel and the
// run statistics.
#include "meshsolver/run_mesh_solver.hpp"

#include <cstdio>
#include <string>

#include "equations/time_integrators.hpp"
#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "mesh/output_domain.hpp"
#include "mesh/space_discretization.hpp"
#include "meshsolver/boundary_bw.hpp"
#include "meshsolver/bw_model.hpp"
#include "meshsolver/equations_bw.hpp"
#include "meshsolver/output_bw.hpp"
#include "meshsolver/processes_bw.hpp"
#include "platform/kvt/kvt.hpp"
#include "run/messages.hpp"
#include "run/progress.hpp"

MeshRunState gMeshRun;

namespace {

void CreateShortWaveTiming(TimingGroup& group) {
    InitTiming(group, "Short Wave Simulation", 6);
    AddTiming(group, kTaskUpdateForcings, "Update forcings");
    AddTiming(group, kTaskSolveBoussinesq, "Solve Bousinesq eq.");
    AddTiming(group, kTaskSetupLinearSystem, "  Setup linear equation system");
    AddTiming(group, kTaskSolveLinearSystem, "  Solve linear Equation system");
    AddTiming(group, kTaskOtherCalculationBW, "Other calculation");
    AddTiming(group, kTaskShortWaveTotal, "Total");
}

void WriteRunStatisticsBW() {
    const TimingTask& calculation = gOverallTiming.tasks[kTaskCalculation - 1];
    const double c = calculation.cpuTotal, e = calculation.wallTotal;
    const Mesh& mesh = gMeshes.meshes[1];
    const double s = gMeshRun.CurrentStep - gMeshRun.FirstStep;
    const double n = mesh.NodeCount, m = mesh.ElementCount;
    WriteBlockHeading("Run Statistics");
    WriteLabelled("Number of time steps                         %", gMeshRun.StepCounter);
    if (c > 0.0) {
        WriteLabelled("Nodes/sec (CPU calculation time)             %", s * n / c);
        WriteLabelled("Elements/sec (CPU calculation time)          %", s * m / c);
    }
    if (e > 0.0) {
        WriteLabelled("Nodes/sec (Elapsed calculation time)         %", s * n / e);
        WriteLabelled("Elements/sec (Elapsed calculationtime)       %", s * m / e);
    }
    WriteLine("");
}

// The loop from the start state to LastStep, or to a cancel or a blow-up.
// False when a cancel was pending before the first step: then nothing is
// closed and no statistics are written.
bool RunTimeLoop(int32_t& runStatus) {
    MeshRunState& r = gMeshRun;
    StartTiming(gOverallTiming, kTaskPreProcessing);
    r.CurrentStep = r.FirstStep;
    r.CurrentTime = r.FirstStep * r.TimeStepInterval;
    // The start state is output like any other step.
    OutputListBW& output = gOutputBW;
    OpenOutputFiles(output.count, output.files);
    WriteOutputHD3D(r.CurrentStep, output.count, output.files, gBwModel);
    // Both value slots of the boundary data hold the start value after the
    // first step's update.
    UpdateForcingsBW(r.CurrentTime, gBwModel);
    WriteLine("COMPUTATION STARTED");
    StartProgress(r.FirstStep, r.LastStep, runStatus);
    StopTiming(gOverallTiming, kTaskPreProcessing);
    if (runStatus < 0) return false;

    const long long nodes = gMeshes.meshes[1].NodeCount;
    for (r.CurrentStep = r.FirstStep + 1; r.CurrentStep <= r.LastStep; ++r.CurrentStep) {
        StartTiming(gOverallTiming, kTaskCalculation);
        ++r.StepCounter;
        r.CurrentTime = r.CurrentStep * r.TimeStepInterval;
        if (r.CurrentStep % 100 == 0) {
            char line[32];
            std::snprintf(line, sizeof line, " Timestep: %10d", r.CurrentStep);
            WriteLine(line);
        }
        SolveTimeStepBW(r.CurrentTime, gBwModel, runStatus);
        if (runStatus < 0) break;
        StopTiming(gOverallTiming, kTaskCalculation);
        StartTiming(gOverallTiming, kTaskPostProcessing);
        WriteOutputHD3D(r.CurrentStep, output.count, output.files, gBwModel);
        StopTiming(gOverallTiming, kTaskPostProcessing);
        StartTiming(gOverallTiming, kTaskCalculation);
        ReportProgress(r.CurrentStep, nodes, runStatus);
        if (runStatus < 0) break;
        StopTiming(gOverallTiming, kTaskCalculation);
    }
    if (runStatus < 0) StopTiming(gOverallTiming, kTaskCalculation);

    StartTiming(gOverallTiming, kTaskPostProcessing);
    WriteLine("COMPUTATION ENDED");
    // A run that ends early closes every file with one more block.
    if (runStatus != 0) WriteOutputHD3D(-1, output.count, output.files, gBwModel);
    CloseOutputFiles(output.count, output.files);
    WriteTimingReport(gBwModel.Timing);
    WriteRunStatisticsBW();
    StopTiming(gOverallTiming, kTaskPostProcessing);
    return true;
}

}  // namespace

void SetupTimeAxis() {
    MeshRunState& r = gMeshRun;
    KvtOpenSection("TIME");
    r.FirstStep = 0;
    int32_t start[6] = {2004, 1, 1, 0, 0, 0};
    KvtGetIntegerList("start_time", start, 6);
    r.TimeStepInterval = 0.0;
    KvtGetDouble("time_step_interval", r.TimeStepInterval);
    r.LastStep = 0;
    KvtGetInteger("number_of_time_steps", r.LastStep);
    KvtCloseSection();
    r.StartDate = MakeDateTime(start[0], start[1], start[2], start[3], start[4], start[5]);
    r.EndDate = AddSeconds(r.StartDate, r.LastStep * r.TimeStepInterval);
}

void SetupBW(int32_t dimensions) {
    BwModel& model = gBwModel;
    KvtOpenSection("BOUSSINESQ_WAVE_MODULE");
    model.timeStepInterval = gMeshRun.TimeStepInterval;
    SetupEquationBW(dimensions, model);
    SetupProcessesBW(model);
    SetupInitCondBW(model);
    SetupBoundCondBW(model);
    SetupOutputBW(model);
    SetupSolutionBW(model);
    KvtCloseSection();
    CreateShortWaveTiming(model.Timing);
}

std::string MeshSolverLogName(const std::string& path) {
    const size_t lower = path.rfind(".bw"), upper = path.rfind(".BW");
    size_t at = std::string::npos;
    if (lower != std::string::npos) at = lower;
    if (upper != std::string::npos && (at == std::string::npos || upper > at)) at = upper;
    if (at == std::string::npos) return path;
    return path.substr(0, at) + ".log";
}

KvtHandle SetupMeshSolver(const std::string& solverFile) {
    int status = 0;
    KvtHandle file = KvtOpenFile(solverFile, false, &status);
    if (status != 0) StopRun("Unable to open " + solverFile);
    KvtUseFile(file);
    KvtOpenTarget("MeshSolverBW");

    int32_t dimensions = 2;
    KvtOpenSection("BASIC_MODEL_PARAMETERS");
    KvtGetInteger("number_of_dimensions", dimensions);
    KvtCloseSection();

    gMeshRun = MeshRunState{};
    SetupTimeAxis();
    gProgress.simulationStart = gMeshRun.StartDate;
    gProgress.timeStep = gMeshRun.TimeStepInterval;
    SetupSpaceDiscretization(dimensions);
    SetupBW(dimensions);
    return file;
}

void RunMeshSolver(const std::string& solverFile, std::string& parameterFileName,
                   int32_t& runStatus) {
    StartTiming(gOverallTiming, kTaskPreProcessing);
    KvtHandle file = SetupMeshSolver(solverFile);
    StopTiming(gOverallTiming, kTaskPreProcessing);

    if (!RunTimeLoop(runStatus)) return;

    StartTiming(gOverallTiming, kTaskPostProcessing);
    kvtClose(&file);
    parameterFileName = MeshSolverLogName(solverFile);
    StopTiming(gOverallTiming, kTaskPostProcessing);
}
