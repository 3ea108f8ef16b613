#include "run/run_state.hpp"

RunState gRun;
