// Process layer: the engine runs alone or under an MPI launcher, and this
// layer hides the message passing and the thread settings behind a few calls.
// It knows the processes, machines and processors of the run and reports
// them in the log ("Computing Environment", "Performance").
#pragma once

#include <omp.h>

#include <string>
#include <string_view>
#include <vector>

struct ProcessState {
    int processId = -1;  // this process's rank; -1 alone or without message passing
    int processCount = 1;
    std::string processorName;  // the host's name
    int machineCount = 1;
    // On process 0: the names of the machines, the machine of each process,
    // and the number of processes on each machine.
    std::vector<std::string> machineNames;
    std::vector<int> processMachine;
    std::vector<int> machineProcesses;
    int processorCount = 1;     // processors seen by the threads runtime
    int maxThreads = 1;         // the runtime's maximum of threads
    int threadCount = 1;        // the number in use
    std::string threadReason;   // why that number, for the log
    int onlineProcessors = 1;   // processors of the machine, whatever this process may use
    int localProcessCount = 1;  // processes of the run on this machine, this one included
    bool mpiActive = false;     // message passing was brought up by ProcessStart
    omp_lock_t threadLock;
};
extern ProcessState gProcess;

// Brings up message passing when started under a launcher (or alone when
// that fails) and reads what the threads runtime offers.
void ProcessStart();
// A barrier and the finalisation of message passing, where it is active.
void ProcessFinish();
// Sets the thread count: wanted (0 or -1: all processors), cut to the
// runtime's maximum and the processor count, at least 1.
void SetThreads(int wanted);

void WriteComputingEnvironment();
void WritePerformance();

// Status arrays of five integers for each request, for a wait on all of them.
int* AllocateMPIStatus(int count);
void DeallocateMPIStatus(int* status);

// The stem of a file that this process writes: stem unchanged when the run
// has one process, stem + "_p" + process id under a launcher with more, so
// that no two processes ever write one file.
std::string ProcessFileStem(std::string_view stem);
