// bw: simulation of short waves in coastal waters and harbours.
#include "run/run_sequence.hpp"
#include "run/signals.hpp"

int main(int argc, char** argv) {
    InstallSignalHandlers();
    RunMain(argc, argv);
}
