// Timing groups: named tasks that the program starts and stops by number.
// A task may run many times; its CPU, user and wall times add up. Each group
// ends the run as a table in the log, and the 2DH loop adds its speed in
// points per second ("Run Statistics").
#pragma once

#include <cstdint>
#include <string>
#include <vector>

struct TimingTask {
    std::string name;
    double cpuStart = 0.0, cpuTotal = 0.0;
    double userStart = 0.0, userTotal = 0.0;
    double wallStart = 0.0, wallTotal = 0.0;
};

struct TimingGroup {
    std::string title;
    int taskCount = 0;              // tasks the group was made for
    int usedCount = 0;              // tasks added
    std::vector<TimingTask> tasks;  // taskCount records, task n at index n - 1
    std::vector<int> order;         // task numbers in the order of adding
};

// Task numbers of the run's two groups.
enum OverallTask { kTaskPreProcessing = 1, kTaskCalculation, kTaskPostProcessing, kTaskTotal };
enum SimulationTask { kTaskXSweep = 1, kTaskYSweep, kTaskOtherCalculation, kTaskSimulationTotal };

extern TimingGroup gOverallTiming;  // "Overall", owned by the run sequence

void InitTiming(TimingGroup& group, const std::string& title, int taskCount);
void AddTiming(TimingGroup& group, int task, const std::string& name);
void StartTiming(TimingGroup& group, int task);
void StopTiming(TimingGroup& group, int task);
// Writes the first count tasks in the order of adding; count < 0: all added tasks.
void WriteTimingReport(const TimingGroup& group, int count = -1);
void WriteRunStatistics(const TimingGroup& group, int64_t timeSteps, int64_t waterPoints,
                        int64_t computationalPoints);

// The three clocks, in seconds.
double CpuSeconds();
double UserSeconds();
double WallSeconds();
// Wall time from a reading of a counter with its rate and maximum: a reading
// below the last one means the counter wrapped, and one period is added to
// the offset that all groups share.
double WallFromCount(int64_t count, int64_t rate, int64_t maxCount);
// Forgets the last reading and the offset (for tests of the wrap).
void ResetWallClock();
