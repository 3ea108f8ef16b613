// The run's own state: the command line's settings, the parameter file and
// the exit code that the solvers set.
#pragma once

#include <string>

#include "platform/kvt/kvt.hpp"

struct RunState {
    int debugLevel = 0;             // -debug: 1; -debug:N: N. 2 logs boundary tables, 3 grid codes
    std::string parameterFileName;  // the path given on the command line
    KvtHandle parameterFileHandle = 0;
    int runExitCode = 0;     // 0 while sound; negative once cancelled or blown up
    bool checkOnly = false;  // -check: read and check the model, compute no step
};
extern RunState gRun;
