#include "run/threads.hpp"

#include <sched.h>
#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <sstream>
#include <thread>

#include "run/messages.hpp"
#include "run/process.hpp"

namespace {

// Set in the environment of the restart, so that the log can tell who set
// the spin count; taken out again once read.
constexpr const char* kRestartMark = "BW_RESTARTED";

// A reading of the processors' ticks and of this process's own time, taken
// when the process starts and again when the thread count is chosen.
struct LoadReading {
    ProcessorTicks ticks;
    double wall = 0.0, cpu = 0.0;  // seconds: monotonic clock, this process's CPU time
};
LoadReading gStartReading;
bool gWaitPolicySetByUs = false;

double ClockSeconds(clockid_t clock) {
    timespec t{};
    clock_gettime(clock, &t);
    return static_cast<double>(t.tv_sec) + 1e-9 * static_cast<double>(t.tv_nsec);
}

LoadReading ReadLoad() {
    LoadReading r;
    std::ifstream in("/proc/stat");
    std::stringstream text;
    text << in.rdbuf();
    r.ticks = ParseProcessorTicks(text.str());
    r.wall = ClockSeconds(CLOCK_MONOTONIC);
    r.cpu = ClockSeconds(CLOCK_PROCESS_CPUTIME_ID);
    return r;
}

// The processors this process may run on, by number.
std::vector<int> AffinityProcessors() {
    std::vector<int> cpus;
    cpu_set_t set;
    CPU_ZERO(&set);
    if (sched_getaffinity(0, sizeof set, &set) != 0) return cpus;
    for (int c = 0; c < CPU_SETSIZE; ++c)
        if (CPU_ISSET(c, &set)) cpus.push_back(c);
    return cpus;
}

// "1 processor", "2 processors".
std::string Processors(int count) {
    return std::to_string(count) + (count == 1 ? " processor" : " processors");
}

// The shortest time over which the idle processors are measured: the ticks
// are 10 ms, and a shorter look says little about programs that run in bursts.
constexpr double kIdleWindowSeconds = 0.25;

}  // namespace

int RequestedThreads(const char* text) {
    if (text == nullptr) return 0;
    char* end = nullptr;
    const long value = std::strtol(text, &end, 10);
    if (end == text || value <= 0) return 0;
    while (*end == ' ') ++end;
    if (*end != '\0' && *end != ',') return 0;
    return static_cast<int>(std::min<long>(value, 1 << 20));
}

ThreadChoice ChooseThreads(const ThreadInputs& in) {
    ThreadChoice c;
    const int limit = std::max(1, std::min(in.processors, in.maxThreads));
    if (in.requested > 0) {
        c.count = std::min(in.requested, limit);
        c.reason = "OMP_NUM_THREADS";
        if (c.count < in.requested)
            c.reason += "=" + std::to_string(in.requested) + ", cut to " +
                        (in.processors <= in.maxThreads ? Processors(in.processors)
                                                        : std::string("the runtime's maximum"));
        return c;
    }
    c.count = limit;
    c.reason = in.maxThreads < in.processors ? "the runtime's maximum" : "one per processor";
    // Processes of the run on one machine share its processors, unless the
    // launcher bound each to processors of its own.
    if (in.localProcesses > 1 && in.processors >= in.onlineProcessors) {
        const int share = std::max(1, in.processors / in.localProcesses);
        if (share < c.count) {
            c.count = share;
            c.reason = Processors(in.processors) + " shared by " +
                       std::to_string(in.localProcesses) + " processes of the run";
        }
    }
    const long long bySize = std::max<long long>(1, in.gridPoints / kPointsPerThread);
    if (bySize < c.count) {
        c.count = static_cast<int>(bySize);
        c.reason = "grid too small to gain from more";
    }
    if (in.idleProcessors >= 0.0) {
        const int byIdle = std::max(
            1, static_cast<int>(std::floor(in.idleProcessors + (1.0 - kIdleShareForThread))));
        if (byIdle < c.count) {
            char idle[32];
            std::snprintf(idle, sizeof idle, "%.1f", in.idleProcessors);
            c.count = byIdle;
            c.reason = std::string("only ") + idle + " of " + Processors(in.processors) + " idle";
        } else if (c.reason == "one per processor") {
            c.reason = "one per idle processor";
        }
    }
    return c;
}

ProcessorTicks ParseProcessorTicks(std::string_view statText) {
    ProcessorTicks t;
    std::istringstream in{std::string(statText)};
    std::string line;
    while (std::getline(in, line)) {
        // "cpuN user nice system idle iowait irq softirq steal guest guest_nice";
        // the line "cpu " is the sum of all and is passed over.
        if (line.size() < 4 || line.compare(0, 3, "cpu") != 0 || line[3] < '0' || line[3] > '9')
            continue;
        std::istringstream fields(line.substr(3));
        int cpu = -1;
        if (!(fields >> cpu)) continue;
        unsigned long long value = 0, total = 0, idle = 0;
        // guest and guest_nice (9 and 10) are already counted in user and nice.
        for (int field = 0; field < 8 && fields >> value; ++field) {
            total += value;
            if (field == 3 || field == 4) idle += value;  // idle, iowait
        }
        t.cpu.push_back(cpu);
        t.idle.push_back(idle);
        t.total.push_back(total);
    }
    return t;
}

double IdleProcessors(const ProcessorTicks& before, const ProcessorTicks& after,
                      const std::vector<int>& cpus, double ownBusy) {
    if (cpus.empty()) return -1.0;
    const auto find = [](const ProcessorTicks& t, int cpu) {
        const auto it = std::find(t.cpu.begin(), t.cpu.end(), cpu);
        return it == t.cpu.end() ? -1 : static_cast<int>(it - t.cpu.begin());
    };
    double idle = 0.0;
    for (int cpu : cpus) {
        const int a = find(before, cpu), b = find(after, cpu);
        if (a < 0 || b < 0 || after.total[b] <= before.total[a] || after.idle[b] < before.idle[a])
            return -1.0;
        idle += static_cast<double>(after.idle[b] - before.idle[a]) /
                static_cast<double>(after.total[b] - before.total[a]);
    }
    return std::min(idle + std::max(ownBusy, 0.0), static_cast<double>(cpus.size()));
}

void SetRunThreads(long long gridPoints) {
    ThreadInputs in;
    in.requested = RequestedThreads(std::getenv("OMP_NUM_THREADS"));
    in.processors = gProcess.processorCount;
    in.onlineProcessors = gProcess.onlineProcessors;
    in.maxThreads = gProcess.maxThreads;
    in.localProcesses = gProcess.localProcessCount;
    in.gridPoints = gridPoints;
    ThreadChoice choice = ChooseThreads(in);
    if (in.requested == 0 && choice.count > 1) {
        // Worth more than one thread: how many processors are idle, over at
        // least kIdleWindowSeconds since the process started.
        const double waited = ClockSeconds(CLOCK_MONOTONIC) - gStartReading.wall;
        if (waited < kIdleWindowSeconds)
            std::this_thread::sleep_for(std::chrono::duration<double>(kIdleWindowSeconds - waited));
        const LoadReading now = ReadLoad();
        const double wall = now.wall - gStartReading.wall;
        const double own = wall > 0.0 ? (now.cpu - gStartReading.cpu) / wall : 0.0;
        in.idleProcessors =
            IdleProcessors(gStartReading.ticks, now.ticks, AffinityProcessors(), own);
        choice = ChooseThreads(in);
        if (in.idleProcessors < 0.0) choice.reason += ", idle processors not known";
    }
    gProcess.threadCount = choice.count;
    gProcess.threadReason = choice.reason;
    omp_set_num_threads(gProcess.threadCount);
    WriteLabelled("Threads in use       : %",
                  std::to_string(choice.count) + " (" + choice.reason + ")");
}

std::vector<std::pair<std::string, std::string>> RestartVariables(const EnvLookup& lookup,
                                                                  int processors) {
    if (processors <= 1 || lookup(kRestartMark) != nullptr) return {};
    if (lookup("OMP_WAIT_POLICY") != nullptr || lookup("GOMP_SPINCOUNT") != nullptr) return {};
    if (RequestedThreads(lookup("OMP_NUM_THREADS")) == 1) return {};
    for (const char* name : {"OMPI_COMM_WORLD_SIZE", "PMIX_RANK", "PMI_RANK", "PMI_SIZE"})
        if (lookup(name) != nullptr) return {};
    return {{"GOMP_SPINCOUNT", std::to_string(kSpinRounds)}, {kRestartMark, "1"}};
}

void RestartWithShortSpin(char** argv) {
    const auto variables = RestartVariables([](const char* name) { return std::getenv(name); },
                                            static_cast<int>(AffinityProcessors().size()));
    if (variables.empty() || argv == nullptr || argv[0] == nullptr) return;
    for (const auto& [name, value] : variables) setenv(name.c_str(), value.c_str(), 1);
    // The same program (argv[0] may be a bare name found on the PATH) with the
    // same arguments and the same process id; nothing has been opened or
    // written yet. When it can't be run, this one goes on as it is.
    execv("/proc/self/exe", argv);
    for (const auto& variable : variables) unsetenv(variable.first.c_str());
}

std::string WaitingThreadsText() {
    const char* policy = std::getenv("OMP_WAIT_POLICY");
    const char* spin = std::getenv("GOMP_SPINCOUNT");
    if (policy != nullptr && strcasecmp(policy, "passive") == 0)
        return "sleep (OMP_WAIT_POLICY=passive)";
    if (policy != nullptr && strcasecmp(policy, "active") == 0)
        return "spin (OMP_WAIT_POLICY=active)";
    if (spin != nullptr)
        return std::string("spin ") + spin + " rounds, then sleep (GOMP_SPINCOUNT" +
               (gWaitPolicySetByUs ? ", set by bw)" : ")");
    return "spin, then sleep (runtime's default)";
}

void NoteThreadStart() {
    gWaitPolicySetByUs = std::getenv(kRestartMark) != nullptr;
    unsetenv(kRestartMark);
    gStartReading = ReadLoad();
}
