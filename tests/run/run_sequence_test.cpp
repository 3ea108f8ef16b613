#include "run/run_sequence.hpp"

#include <gtest/gtest.h>

#include "run/process.hpp"

namespace {

std::string Parse(std::vector<const char*> args, int& level) {
    args.insert(args.begin(), "bw");
    level = 0;
    return ParseArguments(static_cast<int>(args.size()), args.data(), level);
}

TEST(CommandLine, OptionsAndTheFileName) {
    int level = 0;
    EXPECT_EQ(Parse({"model.bw"}, level), "model.bw");
    EXPECT_EQ(level, 0);
    EXPECT_EQ(Parse({"-debug:3", "model.bw"}, level), "model.bw");
    EXPECT_EQ(level, 3);
    EXPECT_EQ(Parse({"-debug:x", "model.bw"}, level), "model.bw");
    EXPECT_EQ(level, 1);  // not a number: the level of -debug stays
    EXPECT_EQ(Parse({"//hud", "-debug", "a.bw", "b.bw"}, level), "b.bw");  // a later name wins
    EXPECT_EQ(level, 1);
    // An option blanks the name read before it.
    EXPECT_EQ(Parse({"model.bw", "-debug"}, level), "");
    EXPECT_EQ(Parse({"-debug"}, level), "");
    EXPECT_EQ(Parse({}, level), "");
}

TEST(CommandLine, ChannelNameDropsTheLaterModelExtension) {
    EXPECT_EQ(ChannelName("runs/harbour.bw"), "runs/harbour");
    EXPECT_EQ(ChannelName("HARBOUR.BW"), "HARBOUR");
    EXPECT_EQ(ChannelName("a.BW.copy.bw"), "a.BW.copy");
    EXPECT_EQ(ChannelName("  model.kvt  "), "model.kvt");
}

TEST(ProcessLayer, ThreadsAreClippedToWhatTheMachineHas) {
    gProcess.processorCount = 4;
    gProcess.maxThreads = 3;
    SetThreads(8);
    EXPECT_EQ(gProcess.threadCount, 3);
    SetThreads(0);
    EXPECT_EQ(gProcess.threadCount, 3);
    SetThreads(-1);
    EXPECT_EQ(gProcess.threadCount, 3);
    SetThreads(2);
    EXPECT_EQ(gProcess.threadCount, 2);
    SetThreads(-7);
    EXPECT_EQ(gProcess.threadCount, 1);
}

TEST(ProcessLayer, FilesCarryTheProcessIdOnlyUnderALauncherWithMore) {
    ProcessState saved = gProcess;
    gProcess.processCount = 1;
    gProcess.processId = -1;
    EXPECT_EQ(ProcessFileStem("dir/model"), "dir/model");
    gProcess.processCount = 2;
    gProcess.processId = 1;
    EXPECT_EQ(ProcessFileStem("dir/model"), "dir/model_p1");
    gProcess.processCount = saved.processCount;
    gProcess.processId = saved.processId;
}

}  // namespace

#include "support/log_capture.hpp"

namespace {

TEST(ProcessLayer, EnvironmentBlockNamesEveryMachineOnProcessZero) {
    bwtest::LogCapture log;
    ProcessState saved = gProcess;
    gProcess.processorName = "node-a";
    gProcess.processCount = 4;
    gProcess.processId = 0;
    gProcess.machineCount = 2;
    gProcess.machineNames = {"node-a", "node-b"};
    gProcess.machineProcesses = {3, 1};
    WriteComputingEnvironment();
    gProcess.processCount = saved.processCount;
    gProcess.processId = saved.processId;
    gProcess.machineCount = saved.machineCount;
    gProcess.machineNames = saved.machineNames;
    gProcess.machineProcesses = saved.machineProcesses;
    gProcess.processorName = saved.processorName;
    const std::string text = log.Text();
    EXPECT_NE(text.find("  Number of processes  : 4\n  Local process id     : 0\n"),
              std::string::npos);
    EXPECT_NE(text.find("  Number of machines   : 2\n"
                        "  Machine            #1: node-a (3)\n"
                        "  Machine            #2: node-b (1)\n"),
              std::string::npos)
        << text;
}

}  // namespace
