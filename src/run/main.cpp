// bw: simulation of short waves in coastal waters and harbours.
#include "run/process.hpp"
#include "run/run_sequence.hpp"
#include "run/signals.hpp"
#include "run/threads.hpp"

int main(int argc, char** argv) {
    // First of all, while nothing is open: waiting threads must not spin
    // long, and the threads runtime reads that only when it loads.
    RestartWithShortSpin(argv);
    InstallSignalHandlers();
    RunMain(argc, argv);
}
