#include "run/run_sequence.hpp"

#include <gtest/gtest.h>

#include "run/process.hpp"
#include "support/log_capture.hpp"

namespace {

// The parameter file is the last name on the command line, "//hud" passed
// over; an option blanks a name read before it; -debug:N sets the level,
// -debug alone or with no number sets 1. The channel's name drops the later
// model extension and the blanks around.
TEST(CommandLine, OptionsAndTheFileName) {
    const char* argv[] = {"bw", "-debug:x", "//HUD", "a.bw", "b.bw", "-debug:2"};
    int level = 0;
    EXPECT_EQ(ParseArguments(5, argv, level), "b.bw");
    EXPECT_EQ(level, 1);
    EXPECT_EQ(ParseArguments(6, argv, level), "");
    EXPECT_EQ(level, 2);
    EXPECT_EQ(ChannelName("HARBOUR.BW"), "HARBOUR");
    EXPECT_EQ(ChannelName("  a.BW.copy.bw  "), "a.BW.copy");
    // The stem is the path less the file's extension, as the log's: a "."
    // in a folder's name stays, and a name without extension is whole.
    EXPECT_EQ(ChannelName("x.bwtests/model.bw"), "x.bwtests/model");
    EXPECT_EQ(ChannelName("x.bwtests/model"), "x.bwtests/model");
    EXPECT_EQ(ChannelName("runs/harbour.kvt"), "runs/harbour");
}

// Threads: 0 or -1 ask for all, cut to the runtime's maximum, at least one.
TEST(ProcessLayer, ThreadsAreClippedToWhatTheMachineHas) {
    const ProcessState saved = gProcess;
    gProcess.processorCount = 4;
    gProcess.maxThreads = 3;
    for (auto [wanted, used] : {std::pair{8, 3}, {-1, 3}, {2, 2}, {-7, 1}}) {
        SetThreads(wanted);
        EXPECT_EQ(gProcess.threadCount, used) << wanted;
    }
    gProcess = saved;
}

// Process 0 names every machine and the number of its processes in the log.
TEST(ProcessLayer, TheEnvironmentBlockNamesEveryMachine) {
    const ProcessState saved = gProcess;
    bwtest::LogCapture log;
    gProcess.processorName = "node-a";
    gProcess.processCount = 4;
    gProcess.processId = 0;
    gProcess.machineCount = 2;
    gProcess.machineNames = {"node-a", "node-b"};
    gProcess.machineProcesses = {3, 1};
    WriteComputingEnvironment();
    gProcess = saved;
    const std::string text = log.Text();
    EXPECT_NE(text.find("  Number of machines   : 2\n"
                        "  Machine            #1: node-a (3)\n"
                        "  Machine            #2: node-b (1)\n"),
              std::string::npos)
        << text;
}

}  // namespace
