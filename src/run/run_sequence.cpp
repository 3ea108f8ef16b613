#include "run/run_sequence.hpp"

#include <cstdlib>
#include <cstring>

#include "input/kvt_access.hpp"
#include "input/model_check.hpp"
#include "input/model_setup.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "run/fpmode.hpp"
#include "run/messages.hpp"
#include "run/process.hpp"
#include "run/progress.hpp"
#include "run/run_state.hpp"
#include "run/threads.hpp"
#include "run/timing.hpp"
#include "run/units.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

namespace {

// The integer behind "-debug:"; the level stays as it is when that is no number.
void ReadDebugLevel(const char* text, int& debugLevel) {
    char* end = nullptr;
    const long level = std::strtol(text, &end, 10);
    while (end != nullptr && *end == ' ') ++end;
    if (end != text && end != nullptr && *end == '\0') debugLevel = static_cast<int>(level);
}

[[noreturn]] void StopOnSyntaxError(const std::string& fileName) {
    int line = 0, column = 0;
    const char* text = nullptr;
    kvtGetSyntaxErr(gRun.parameterFileHandle, &line, &column, &text);
    std::string message(TrimRight(text != nullptr ? text : "syntax error"));
    message = std::string(TrimRight(message)) + Filled(" near line %", line);
    message = std::string(TrimRight(message)) + Filled(" and colum %", column);
    message = std::string(TrimRight(message)) + Filled(" in file %", fileName);
    StopRun(message);
}

}  // namespace

std::string ParseArguments(int argc, const char* const* argv, int& debugLevel, bool* check) {
    std::string name;
    for (int i = 1; i < argc; ++i) {
        const char* arg = argv[i];
        if (std::strcmp(arg, "-check") == 0) {
            // An option of its own beside -debug, and like it it blanks the
            // name read before it.
            if (check != nullptr) *check = true;
            name.clear();
        } else if (std::strncmp(arg, "-debug", 6) == 0) {
            debugLevel = 1;
            if (arg[6] == ':') ReadDebugLevel(arg + 7, debugLevel);
            name.clear();
        } else if (strcasecmp(arg, "//hud") == 0) {
            continue;  // the viewer's switch: the channel is always there
        } else {
            name = arg;
        }
    }
    return std::string(Trim(name));
}

std::string ChannelName(std::string_view fileName) {
    // The extension is what follows the last "." of the file's own name, as
    // for the log: a "." in a folder's name is part of the stem.
    std::string name(Trim(fileName));
    const size_t slash = name.find_last_of('/');
    const size_t dot = name.rfind('.');
    if (dot != std::string::npos && (slash == std::string::npos || dot > slash)) name.erase(dot);
    return name;
}

void ReadCommandLine(int argc, const char* const* argv) {
    ProcessStart();
    gRun.debugLevel = 0;
    gRun.checkOnly = false;
    const std::string fileName = ParseArguments(argc, argv, gRun.debugLevel, &gRun.checkOnly);
    if (fileName.empty()) StopRun(kUsage);
    gRun.parameterFileName = fileName;

    int status = 0;
    gRun.parameterFileHandle = KvtOpenFile(fileName, true, &status);
    if (status != 0) {
        // A file that is there but can't be read says why.
        const std::string reason = KvtLoadFailure();
        StopRun(std::string(kProgramTitle) + ": Unable to open " + fileName +
                (reason.empty() ? "" : ": " + reason));
    }
    SetLogUnit(gKvtAccess.logUnit);
    // The channel opens once the file is known to be there, so that a mistyped
    // name leaves no progress file behind.
    OpenProgressChannel(ChannelName(fileName));
    ProgressValue(0);
    if (kvtPeekErrorGlb() == kKvtErrSyntax) StopOnSyntaxError(fileName);
    WriteComputingEnvironment();
}

void Shutdown(const std::string& /*fileName*/, int exitCode) {
    WritePerformance();
    if (gBasic.numberOfDimensions > 1) kvtClose(&gRun.parameterFileHandle);
    WriteLine("");
    // The log's last line tells how the run ended; the viewer waits for it.
    WriteLine(exitCode == 0 ? "Successful completion" : "Abnormal completion");
    if (gMessages.logUnit > 0) ReleaseUnit(gMessages.logUnit);
    gKvtAccess.logUnit = -1;
    SetLogUnit(-1);
    ProcessFinish();
    NormalExit(exitCode);
}

void RunMain(int argc, const char* const* argv) {
    SetFloatingPointMode();
    ReadCommandLine(argc, argv);

    InitTiming(gOverallTiming, "Overall", 4);
    AddTiming(gOverallTiming, kTaskPreProcessing, "Pre-processing");
    AddTiming(gOverallTiming, kTaskCalculation, "Calculation");
    AddTiming(gOverallTiming, kTaskPostProcessing, "Post-processing");
    AddTiming(gOverallTiming, kTaskTotal, "Total");
    StartTiming(gOverallTiming, kTaskTotal);
    StartTiming(gOverallTiming, kTaskPreProcessing);

    ReadModelSetup(gRun.parameterFileHandle, gRun.parameterFileName);
    // What the file holds and no setting read: mistyped or misplaced keys.
    KvtWarnUnread(gRun.parameterFileHandle);
    if (gRun.checkOnly) {
        // bw -check: everything is read and checked; the run ends here. A
        // profile is set up by the mesh solver from its file as well: its
        // maps, codes and output places are read, its slot and sponges checked.
        if (gBasic.numberOfDimensions == 1) {
            KvtHandle solver = SetupMeshSolver(gMeshSolverFileName);
            kvtClose(&solver);
        }
        WriteModelCheck();
        StopTiming(gOverallTiming, kTaskPreProcessing);
        StopTiming(gOverallTiming, kTaskTotal);
        Shutdown(gRun.parameterFileName, 0);
    }
    // As many threads as the grid has work for and processors are idle, or
    // OMP_NUM_THREADS; the log says how many and why.
    SetRunThreads(static_cast<long long>(gGrid.Points()));
    StopTiming(gOverallTiming, kTaskPreProcessing);

    // The solver hands back its exit code: 0, or -1 after a cancel (or a
    // blow-up of the mesh solver). A 1DH model is run from the mesh solver's
    // file that the model reader wrote; the run's name becomes that of its log.
    if (gBasic.numberOfDimensions == 2) Compute(gRun.runExitCode);
    if (gBasic.numberOfDimensions == 1)
        RunMeshSolver(gMeshSolverFileName, gRun.parameterFileName, gRun.runExitCode);

    StopTiming(gOverallTiming, kTaskTotal);
    WriteTimingReport(gOverallTiming);
    Shutdown(gRun.parameterFileName, gRun.runExitCode);
}
