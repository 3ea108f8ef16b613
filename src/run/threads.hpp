// The thread count of a run and how waiting threads wait. A thread more
// pays only on a grid with work enough for it and on a processor nobody else
// uses: the count comes from OMP_NUM_THREADS when set, else from the grid's
// size and the processors found idle; and the threads runtime is made to
// spin only briefly before its waiting threads sleep.
#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

// What the default thread count of a run is chosen from.
struct ThreadInputs {
    int requested = 0;             // OMP_NUM_THREADS's first value; 0 when it is not set
    int processors = 1;            // processors this process may run on
    int onlineProcessors = 1;      // processors of the machine
    int maxThreads = 1;            // the runtime's maximum
    int localProcesses = 1;        // processes of the run on this machine
    long long gridPoints = 0;      // points of the grid
    double idleProcessors = -1.0;  // processors found idle before the run; < 0 not known
};
struct ThreadChoice {
    int count = 1;
    std::string reason;  // for the log: "grid too small to gain from more", ...
};
// Below this many grid points a thread, a thread more costs more in the
// starts and waits of the parallel loops than it gains (bwbench, central
// sweeps, quiet machine: 2 threads lose up to 200 x 200 points and gain
// from 300 x 300).
constexpr long long kPointsPerThread = 45000;
// A processor counts as free for a thread when it was idle at least this
// share of the time: a thread on a processor shared with another program
// holds up every barrier of its team.
constexpr double kIdleShareForThread = 0.75;
// The thread count of a run. A request is honoured up to the processors and
// the runtime's maximum. Without one: no more threads than the grid has
// work for (kPointsPerThread each), than processors this process has to
// itself (those it may run on, shared among the run's processes on the
// machine unless the launcher bound each to its own), nor than processors
// that were idle; never fewer than 1.
ThreadChoice ChooseThreads(const ThreadInputs& in);

// The first value of OMP_NUM_THREADS ("4" or "4,2"); 0 when text is null,
// empty or no positive number.
int RequestedThreads(const char* text);

// Busy and total ticks of each processor, by number, from the text of /proc/stat.
struct ProcessorTicks {
    std::vector<int> cpu;
    std::vector<unsigned long long> idle, total;
};
ProcessorTicks ParseProcessorTicks(std::string_view statText);
// The processors idle between two readings, summed over the processors
// named in cpus (each counts its share of idle ticks), with ownBusy (the
// processors' worth of time this process itself used between them) added
// back, since that time is free for its threads. < 0 when a processor of
// cpus is missing from a reading or no tick passed.
double IdleProcessors(const ProcessorTicks& before, const ProcessorTicks& after,
                      const std::vector<int>& cpus, double ownBusy);

// Chooses the thread count of a run on a grid of gridPoints points (from
// OMP_NUM_THREADS when set, else by ChooseThreads with the processors
// measured idle since ProcessStart), sets it and writes it with its reason
// to the log.
void SetRunThreads(long long gridPoints);

// Waiting threads of the runtime spin 300 000 rounds by default before they
// sleep, and a spinning thread on a processor shared with another program
// holds up the whole team for as long (ten times slower runs on a busy
// machine). Sleeping at once costs a wake-up at every parallel loop (a
// tenth of the speed of 2 threads on 600 x 400 points); a short spin keeps
// the speed on an idle machine and bounds the loss on a busy one. The
// runtime reads the count once, when it loads: when neither OMP_WAIT_POLICY
// nor GOMP_SPINCOUNT is set, the program runs itself again with
// GOMP_SPINCOUNT=kSpinRounds. Not under an MPI launcher (the launcher's
// settings stand), not with one thread, and never twice: returns only when
// no restart is made.
constexpr int kSpinRounds = 10000;
void RestartWithShortSpin(char** argv);

// The variables RestartWithShortSpin sets, given how the environment
// reads (lookup: the value of a variable or null) and the processors this
// process may run on; empty when no restart is due.
using EnvLookup = std::function<const char*(const char*)>;
std::vector<std::pair<std::string, std::string>> RestartVariables(const EnvLookup& lookup,
                                                                  int processors);

// Notes, when the process starts, whether the restart set the spin count and
// the processors' ticks from which SetRunThreads measures the idle ones.
void NoteThreadStart();
// How waiting threads wait, for the log ("spin 10000 rounds, then sleep ...").
std::string WaitingThreadsText();
