// The run of a 1DH model: opens the mesh solver's file, sets up time, meshes
// and the Boussinesq module, runs the time loop with progress and cancel,
// writes the output files and the run statistics.
#pragma once

#include <cstdint>
#include <string>

#include "platform/kvt/kvt.hpp"
#include "run/datetime.hpp"
#include "run/timing.hpp"

// The time axis and the loop of the mesh solver.
struct MeshRunState {
    int32_t FirstStep = 0;  // 0: there is no restart
    int32_t LastStep = 0;   // number_of_time_steps
    double TimeStepInterval = 0.0;
    DateTime StartDate, EndDate;
    int32_t CurrentStep = 0;   // after a full run the step behind the last
    double CurrentTime = 0.0;  // CurrentStep x TimeStepInterval, seconds from StartDate
    int32_t StepCounter = 0;   // steps computed
};
extern MeshRunState gMeshRun;

// Tasks of the group "Short Wave Simulation" (BwModel::Timing), created by
// the setup; the integrator times its parts in it.
enum ShortWaveTask {
    kTaskUpdateForcings = 1,
    kTaskSolveBoussinesq,
    kTaskSetupLinearSystem,
    kTaskSolveLinearSystem,
    kTaskOtherCalculationBW,
    kTaskShortWaveTotal
};

// parameterFileName becomes the name of the log for the shutdown; runStatus
// is 0, or -1 after a cancel or a blow-up.
void RunMeshSolver(const std::string& solverFile, std::string& parameterFileName,
                   int32_t& runStatus);

// Opens the solver file ("Unable to open " when it can't) and sets up the
// time axis, the meshes and the Boussinesq module from it; the file stays
// open for the run and is handed back for its close.
KvtHandle SetupMeshSolver(const std::string& solverFile);
// TIME of the solver file: start, step and number of steps.
void SetupTimeAxis();
// The BOUSSINESQ_WAVE_MODULE section: equations, processes, start state,
// boundaries, output and solution technique.
void SetupBW(int32_t dimensions);
// The name of the log of a run whose solver file is path: the later of
// ".bw" and ".BW" and all behind it becomes ".log"; a name with neither
// stays as it is.
std::string MeshSolverLogName(const std::string& path);
