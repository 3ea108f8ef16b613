#include "run/timing.hpp"

#include <sys/resource.h>

#include <algorithm>
#include <cstdio>
#include <ctime>

#include "run/messages.hpp"

TimingGroup gOverallTiming;

namespace {

int64_t gLastCount = 0;
double gWallOffset = 0.0;

const std::string kHyphens = "  " + std::string(66, '-');

struct Clocks {
    double cpu, user, wall;
};

Clocks ReadClocks() {
    return {CpuSeconds(), UserSeconds(), WallSeconds()};
}

bool ValidTask(const TimingGroup& group, int task) {
    return task >= 1 && task <= group.taskCount;
}

void ReadStart(TimingTask& t) {
    const Clocks now = ReadClocks();
    t.cpuStart = now.cpu;
    t.userStart = now.user;
    t.wallStart = now.wall;
}

std::string Column(const char* format, double value, int width) {
    char buf[64];
    std::snprintf(buf, sizeof buf, format, width, value);
    return buf;
}

}  // namespace

double CpuSeconds() {
    timespec ts{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &ts);
    return static_cast<double>(ts.tv_sec) + 1e-9 * static_cast<double>(ts.tv_nsec);
}

double UserSeconds() {
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return static_cast<double>(usage.ru_utime.tv_sec) +
           1e-6 * static_cast<double>(usage.ru_utime.tv_usec);
}

double WallFromCount(int64_t count, int64_t rate, int64_t maxCount) {
    if (count < gLastCount)
        gWallOffset += static_cast<double>(maxCount) / static_cast<double>(rate);
    gLastCount = count;
    return gWallOffset + static_cast<double>(count) / static_cast<double>(rate);
}

void ResetWallClock() {
    gLastCount = 0;
    gWallOffset = 0.0;
}

double WallSeconds() {
    timespec ts{};
    clock_gettime(CLOCK_MONOTONIC, &ts);
    const int64_t count = static_cast<int64_t>(ts.tv_sec) * 1000000000 + ts.tv_nsec;
    return WallFromCount(count, 1000000000, INT64_MAX);
}

void InitTiming(TimingGroup& group, const std::string& title, int taskCount) {
    if (taskCount < 1) ReportFatal("InitTiming: Wrong number of timings");
    group.title = title;
    group.taskCount = taskCount;
    group.usedCount = 0;
    group.tasks.assign(taskCount, TimingTask{});
    group.order.assign(taskCount, 0);
    for (int n = 1; n <= taskCount; ++n) group.tasks[n - 1].name = Filled("task_%", n);
}

void AddTiming(TimingGroup& group, int task, const std::string& name) {
    if (!ValidTask(group, task) || group.usedCount >= group.taskCount)
        ReportFatal("AddTiming: Wrong timing number");
    group.order[group.usedCount++] = task;
    group.tasks[task - 1].name = name;
    ReadStart(group.tasks[task - 1]);
}

void StartTiming(TimingGroup& group, int task) {
    if (ValidTask(group, task)) ReadStart(group.tasks[task - 1]);
}

void StopTiming(TimingGroup& group, int task) {
    if (!ValidTask(group, task)) return;
    TimingTask& t = group.tasks[task - 1];
    const Clocks now = ReadClocks();
    t.cpuTotal += now.cpu - t.cpuStart;
    t.userTotal += now.user - t.userStart;
    t.wallTotal += now.wall - t.wallStart;
}

void WriteTimingReport(const TimingGroup& group, int count) {
    const int rows = count < 0 ? group.usedCount : std::min(count, group.usedCount);
    if (rows < 1) return;
    WriteBlockHeading(std::string(TrimRight(group.title)) + " Timings");
    WriteLine(kHyphens);
    char head[128];
    std::snprintf(head, sizeof head, "  Task%30s%16s%16s", "", "CPU time", "Elapsed time");
    WriteLine(head);
    WriteLine(kHyphens);
    for (int i = 0; i < rows; ++i) {
        const TimingTask& t = group.tasks[group.order[i] - 1];
        if (TrimRight(t.name) == "Total") WriteLine(kHyphens);
        std::string name = t.name.substr(0, 34);
        name.resize(34, ' ');
        WriteLine("  " + name + Column("%*.2f", t.cpuTotal, 16) + Column("%*.2f", t.wallTotal, 16));
    }
    WriteLine(kHyphens);
    WriteBlockHeading("");
}

void WriteRunStatistics(const TimingGroup& group, int64_t timeSteps, int64_t waterPoints,
                        int64_t computationalPoints) {
    char line[160];
    WriteBlockHeading("Run Statistics");
    std::snprintf(line, sizeof line, "  Number of water points                %15lld",
                  static_cast<long long>(waterPoints));
    WriteLine(line);
    std::snprintf(line, sizeof line, "  Number of time steps                  %15lld",
                  static_cast<long long>(timeSteps));
    WriteLine(line);
    std::snprintf(line, sizeof line, "  Total number of computational points  %15lld",
                  static_cast<long long>(computationalPoints));
    WriteLine(line);
    if (group.taskCount >= kTaskCalculation) {
        const TimingTask& calc = group.tasks[kTaskCalculation - 1];
        const double total = static_cast<double>(computationalPoints);
        if (calc.wallTotal > 0.0) {
            if (calc.cpuTotal > 0.0) {
                std::snprintf(line, sizeof line,
                              "  CPS (CPU calculation time)            %15.1f [points/sec]",
                              total / calc.cpuTotal);
                WriteLine(line);
            }
            std::snprintf(line, sizeof line,
                          "  CPS (Elapsed calculation time)        %15.1f [points/sec]",
                          total / calc.wallTotal);
            WriteLine(line);
        }
    }
    WriteBlockHeading("");
}
