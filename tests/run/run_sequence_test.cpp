#include "run/run_sequence.hpp"

#include <gtest/gtest.h>

#include "run/process.hpp"
#include "support/log_capture.hpp"

namespace {

// The parameter file is the last name on the command line; an option blanks
// a name read before it; -debug:N sets the level, -debug alone sets 1.
TEST(CommandLine, OptionsAndTheFileName) {
    const struct {
        std::vector<const char*> args;
        const char* name;
        int level;
    } cases[] = {
        {{"model.bw"}, "model.bw", 0},
        {{"-debug:3", "model.bw"}, "model.bw", 3},
        {{"-debug:x", "model.bw"}, "model.bw", 1},  // not a number: the level of -debug stays
        {{"//hud", "-debug", "a.bw", "b.bw"}, "b.bw", 1},
        {{"model.bw", "-debug"}, "", 1},
    };
    for (const auto& c : cases) {
        std::vector<const char*> argv = {"bw"};
        argv.insert(argv.end(), c.args.begin(), c.args.end());
        int level = 0;
        EXPECT_EQ(ParseArguments(static_cast<int>(argv.size()), argv.data(), level), c.name)
            << argv.size();
        EXPECT_EQ(level, c.level) << argv.size();
    }
    EXPECT_EQ(ChannelName("runs/harbour.bw"), "runs/harbour");
    EXPECT_EQ(ChannelName("HARBOUR.BW"), "HARBOUR");
    EXPECT_EQ(ChannelName("a.BW.copy.bw"), "a.BW.copy");  // only the later extension goes
    EXPECT_EQ(ChannelName("  model.kvt  "), "model.kvt");
}

// Threads: 0 or -1 ask for all, cut to the runtime's maximum, at least one.
TEST(ProcessLayer, ThreadsAreClippedToWhatTheMachineHas) {
    const ProcessState saved = gProcess;
    gProcess.processorCount = 4;
    gProcess.maxThreads = 3;
    for (auto [wanted, used] : {std::pair{8, 3}, {0, 3}, {-1, 3}, {2, 2}, {-7, 1}}) {
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
