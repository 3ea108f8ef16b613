#include "run/timing.hpp"

#include <gtest/gtest.h>

#include "support/log_capture.hpp"

namespace {

// A task's times add up; a stop without a new start counts again since the
// last start; numbers beyond the group are passed over, but fatal on making.
// The table lists tasks in the order of adding, "Total" set off by a rule
// wherever it was added, under a heading 70 wide; a group without tasks
// writes nothing. The run's speed in points a second shows only once the
// calculation was timed.
TEST(TimingDeathTest, TasksAddUpInATableAndGiveTheSpeed) {
    TimingGroup group;
    EXPECT_EXIT(InitTiming(group, "x", 0), testing::ExitedWithCode(1), "");
    InitTiming(group, "Overall", 4);
    EXPECT_EXIT(AddTiming(group, 5, "five"), testing::ExitedWithCode(1), "");
    AddTiming(group, 4, "Total");
    AddTiming(group, 1, "Pre-processing");
    AddTiming(group, 2, "Calculation");
    group.tasks[0].wallStart = WallSeconds() - 1.0;  // as if started a second ago
    StopTiming(group, 1);
    const double once = group.tasks[0].wallTotal;
    EXPECT_GE(once, 1.0);
    StopTiming(group, 1);
    EXPECT_GE(group.tasks[0].wallTotal, 2.0 * once - 1e-6);
    StartTiming(group, 9);
    StopTiming(group, 9);

    bwtest::LogCapture log;
    group.tasks[0].cpuTotal = 1.234;
    group.tasks[0].wallTotal = 12.5;
    WriteTimingReport(group, 3);
    WriteTimingReport(TimingGroup{});
    auto lines = log.Lines();
    ASSERT_EQ(lines.size(), 12u);
    EXPECT_EQ(lines[1], std::string(26, '=') + " Overall Timings " + std::string(27, '='));
    EXPECT_EQ(lines[6], "  " + std::string(66, '-'));  // before "Total", which was added first
    EXPECT_EQ(lines[7].substr(0, 7), "  Total");
    EXPECT_EQ(lines[8],
              "  Pre-processing" + std::string(20, ' ') + "            1.23           12.50");
    EXPECT_EQ(lines[11], std::string(70, '='));  // the closing rule

    WriteRunStatistics(group, 100, 2500, 250000);
    group.tasks[1].cpuTotal = 2.0;
    group.tasks[1].wallTotal = 4.0;
    WriteRunStatistics(group, 100, 2500, 250000);
    const std::string text = log.Text();
    const std::string cpu = "  CPS (CPU calculation time)                   125000.0 [points/sec]";
    EXPECT_EQ(text.find("CPS"), text.find(cpu) + 2);  // the first CPS is in the second block
    EXPECT_GT(text.find("CPS"), text.find("Run Statistics", text.find("Run Statistics") + 1));
    EXPECT_NE(text.find("  CPS (Elapsed calculation time)                62500.0 [points/sec]\n"),
              std::string::npos);
}

}  // namespace
