#include "run/timing.hpp"

#include <gtest/gtest.h>

#include <thread>

#include "support/log_capture.hpp"

namespace {

TEST(WallClock, AWrapAddsOnePeriod) {
    ResetWallClock();
    EXPECT_DOUBLE_EQ(WallFromCount(90, 10, 100), 9.0);
    // The counter wrapped from 90 past 100 to 5: one period of 100 / 10 s is added.
    EXPECT_DOUBLE_EQ(WallFromCount(5, 10, 100), 10.5);
    EXPECT_DOUBLE_EQ(WallFromCount(7, 10, 100), 10.7);
    ResetWallClock();
}

TEST(TimingGroupTest, TasksAddUpAndStopTwiceCountsAgain) {
    TimingGroup group;
    InitTiming(group, "2D Wave Simulation", 4);
    EXPECT_EQ(group.tasks[2].name, "task_3");
    AddTiming(group, 1, "X-sweep");
    group.tasks[0].wallStart = WallSeconds() - 1.0;  // as if started a second ago
    StopTiming(group, 1);
    const double once = group.tasks[0].wallTotal;
    EXPECT_GE(once, 1.0);
    StopTiming(group, 1);  // no new start: the time since the last start counts again
    EXPECT_GE(group.tasks[0].wallTotal, 2.0 * once - 1e-6);
    StartTiming(group, 9);  // beyond the group: passed over
    StopTiming(group, 9);
}

TEST(TimingGroupDeathTest, BadNumbersAreFatal) {
    TimingGroup group;
    EXPECT_EXIT(InitTiming(group, "x", 0), testing::ExitedWithCode(1), "");
    InitTiming(group, "x", 2);
    EXPECT_EXIT(AddTiming(group, 3, "three"), testing::ExitedWithCode(1), "");
}

TEST(TimingReport, RowsInTheOrderOfAddingWithTheTotalSetOff) {
    bwtest::LogCapture log;
    TimingGroup group;
    InitTiming(group, "Overall", 4);
    AddTiming(group, 4, "Total");
    AddTiming(group, 1, "Pre-processing");
    AddTiming(group, 2, "Calculation");
    group.tasks[0].cpuTotal = 1.234;
    group.tasks[0].wallTotal = 12.5;
    WriteTimingReport(group, 3);       // three of four tasks were added
    WriteTimingReport(TimingGroup{});  // a group with no tasks writes nothing
    auto lines = log.Lines();
    ASSERT_EQ(lines.size(), 12u);
    EXPECT_EQ(lines[1], std::string(26, '=') + " Overall Timings " + std::string(27, '='));
    const std::string hyphens = "  " + std::string(66, '-');
    EXPECT_EQ(lines[3], hyphens);
    EXPECT_EQ(lines[4], "  Task" + std::string(30, ' ') + "        CPU time    Elapsed time");
    EXPECT_EQ(lines[6], hyphens);  // before "Total", which was added first
    EXPECT_EQ(lines[7].substr(0, 7), "  Total");
    EXPECT_EQ(lines[8],
              "  Pre-processing" + std::string(20, ' ') + "            1.23           12.50");
    EXPECT_EQ(lines[9].substr(0, 13), "  Calculation");
    EXPECT_EQ(lines[10], hyphens);
    EXPECT_EQ(lines[11], std::string(70, '='));
}

TEST(TimingReport, RunStatisticsShowSpeedOnlyWhenTimed) {
    bwtest::LogCapture log;
    TimingGroup group;
    InitTiming(group, "Overall", 4);
    WriteRunStatistics(group, 100, 2500, 250000);
    group.tasks[1].cpuTotal = 2.0;
    group.tasks[1].wallTotal = 4.0;
    WriteRunStatistics(group, 100, 2500, 250000);
    const std::string text = log.Text();
    EXPECT_NE(text.find("  Number of water points                           2500\n"),
              std::string::npos);
    EXPECT_NE(text.find("  Total number of computational points           250000\n"),
              std::string::npos);
    // The first block has no speed; the second has both.
    const std::string cpu = "  CPS (CPU calculation time)            " + std::string(7, ' ') +
                            "125000.0 [points/sec]\n";
    const std::string wall =
        "  CPS (Elapsed calculation time)        " + std::string(8, ' ') + "62500.0 [points/sec]\n";
    EXPECT_EQ(text.find("CPS"), text.find(cpu) + 2);
    EXPECT_NE(text.find(wall), std::string::npos);
    EXPECT_GT(text.find("CPS"), text.find("Run Statistics", 10));
}

}  // namespace
