// The thread count of a run: what it is chosen from (OMP_NUM_THREADS, the
// grid's size, the processors and how idle they are), how the processors'
// idle time is read, and the restart that shortens the spin of waiting threads.
#include "run/threads.hpp"

#include <gtest/gtest.h>
#include <sched.h>

#include <cmath>
#include <map>
#include <string>

#include "run/process.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

// A two-processor machine, a grid large enough for both, nothing known of
// the load: the inputs each case below changes one or two of.
ThreadInputs TwoProcessors() {
    ThreadInputs in;
    in.processors = in.onlineProcessors = in.maxThreads = 2;
    in.gridPoints = 1000 * 1000;
    return in;
}

// A request is honoured whatever the grid and the load, up to the processors.
TEST(ThreadChoice, OmpNumThreadsIsHonouredUpToTheProcessors) {
    ThreadInputs in = TwoProcessors();
    in.gridPoints = 10;
    in.idleProcessors = 0.0;
    in.requested = 2;
    ThreadChoice c = ChooseThreads(in);
    EXPECT_EQ(c.count, 2);
    EXPECT_EQ(c.reason, "OMP_NUM_THREADS");

    in.requested = 1;
    in.gridPoints = 1000 * 1000;
    in.idleProcessors = 2.0;
    EXPECT_EQ(ChooseThreads(in).count, 1);

    in.requested = 8;
    c = ChooseThreads(in);
    EXPECT_EQ(c.count, 2);
    EXPECT_EQ(c.reason, "OMP_NUM_THREADS=8, cut to 2 processors");

    in.processors = in.onlineProcessors = 16;
    in.maxThreads = 4;  // OMP_THREAD_LIMIT or the like
    c = ChooseThreads(in);
    EXPECT_EQ(c.count, 4);
    EXPECT_EQ(c.reason, "OMP_NUM_THREADS=8, cut to the runtime's maximum");
}

// Without a request: a thread for every kPointsPerThread points at most, so
// that a small grid runs on one thread and a larger one on several.
TEST(ThreadChoice, SmallGridsRunOnOneThread) {
    ThreadInputs in = TwoProcessors();
    in.gridPoints = 2 * kPointsPerThread - 1;
    ThreadChoice c = ChooseThreads(in);
    EXPECT_EQ(c.count, 1);
    EXPECT_EQ(c.reason, "grid too small to gain from more");

    in.gridPoints = 2 * kPointsPerThread;
    c = ChooseThreads(in);
    EXPECT_EQ(c.count, 2);
    EXPECT_EQ(c.reason, "one per processor");

    // On a larger machine the grid sets how many of its processors are used.
    in.processors = in.onlineProcessors = in.maxThreads = 16;
    in.gridPoints = 3 * kPointsPerThread + kPointsPerThread / 2;
    EXPECT_EQ(ChooseThreads(in).count, 3);
    in.gridPoints = 0;  // a grid not set up yet still gets one thread
    EXPECT_EQ(ChooseThreads(in).count, 1);
}

// Processors busy with other programs get no thread: a thread that shares
// its processor holds up the whole team at every barrier.
TEST(ThreadChoice, BusyProcessorsGetNoThread) {
    ThreadInputs in = TwoProcessors();
    in.idleProcessors = 0.6;  // two busy loops beside this run
    ThreadChoice c = ChooseThreads(in);
    EXPECT_EQ(c.count, 1);
    EXPECT_EQ(c.reason, "only 0.6 of 2 processors idle");

    in.idleProcessors = 1.0 + kIdleShareForThread - 0.05;  // the second one busy a quarter
    EXPECT_EQ(ChooseThreads(in).count, 1);
    in.idleProcessors = 1.0 + kIdleShareForThread + 0.05;
    c = ChooseThreads(in);
    EXPECT_EQ(c.count, 2);
    EXPECT_EQ(c.reason, "one per idle processor");

    // Idle processors never raise the count above what the grid is worth.
    in.idleProcessors = 2.0;
    in.gridPoints = kPointsPerThread;
    EXPECT_EQ(ChooseThreads(in).count, 1);

    in.processors = in.onlineProcessors = in.maxThreads = 8;
    in.gridPoints = 1000 * 1000;
    in.idleProcessors = 5.3;
    c = ChooseThreads(in);
    EXPECT_EQ(c.count, 5);
    EXPECT_EQ(c.reason, "only 5.3 of 8 processors idle");
}

// Processes of one run on one machine divide its processors between them,
// unless the launcher bound each to processors of its own; the runtime's
// maximum is a limit too.
TEST(ThreadChoice, ProcessesOfTheRunShareTheMachine) {
    ThreadInputs in = TwoProcessors();
    in.localProcesses = 2;
    ThreadChoice c = ChooseThreads(in);
    EXPECT_EQ(c.count, 1);
    EXPECT_EQ(c.reason, "2 processors shared by 2 processes of the run");

    in.processors = in.maxThreads = in.onlineProcessors = 8;
    in.localProcesses = 3;
    EXPECT_EQ(ChooseThreads(in).count, 2);

    in.processors = in.maxThreads = 4;  // bound to 4 of the 8
    EXPECT_EQ(ChooseThreads(in).count, 4);

    in.localProcesses = 1;
    in.maxThreads = 3;
    c = ChooseThreads(in);
    EXPECT_EQ(c.count, 3);
    EXPECT_EQ(c.reason, "the runtime's maximum");
}

// OMP_NUM_THREADS as the runtime reads it: the first value of a list; what
// is no positive number is no request.
TEST(ThreadChoice, RequestedThreadsReadsTheFirstValue) {
    const std::map<std::string, int> cases = {{"4", 4},  {"4,2", 4}, {" 3", 3}, {"2 ", 2},
                                              {"", 0},   {"abc", 0}, {"0", 0},  {"-2", 0},
                                              {"2x", 0}, {"1", 1},   {"1,1", 1}};
    for (const auto& [text, expected] : cases)
        EXPECT_EQ(RequestedThreads(text.c_str()), expected) << '"' << text << '"';
    EXPECT_EQ(RequestedThreads(nullptr), 0);
}

// A reading of /proc/stat: one entry per processor line, the sum line and
// the other lines passed over, idle and iowait counted idle, guest time not
// counted twice (it is in user and nice already).
constexpr const char* kStatBefore =
    "cpu  300 0 100 1000 0 0 0 0 0 0\n"
    "cpu0 100 0 50 400 10 0 0 0 0 0\n"
    "cpu1 200 0 50 600 0 0 0 0 40 0\n"
    "cpu3 0 0 0 1000 0 0 0 0 0 0\n"
    "intr 12345 0 0\n"
    "ctxt 999\n"
    "cpufreq 1 2 3\n";
constexpr const char* kStatAfter =
    "cpu  400 0 100 1100 0 0 0 0 0 0\n"
    "cpu0 190 0 60 400 10 0 0 0 0 0\n"   // 100 ticks, none idle
    "cpu1 210 0 50 670 20 0 0 0 50 0\n"  // 100 ticks, 90 idle
    "cpu3 0 0 0 1100 0 0 0 0 0 0\n";     // 100 ticks, all idle

TEST(IdleProcessors, ProcStatIsReadPerProcessor) {
    const ProcessorTicks t = ParseProcessorTicks(kStatBefore);
    ASSERT_EQ(t.cpu, (std::vector<int>{0, 1, 3}));
    EXPECT_EQ(t.idle, (std::vector<unsigned long long>{410, 600, 1000}));
    EXPECT_EQ(t.total, (std::vector<unsigned long long>{560, 850, 1000}));
    EXPECT_TRUE(ParseProcessorTicks("").cpu.empty());
}

// The idle share of each processor this process may run on, summed, with
// this process's own use added back; unknown (< 0) when a processor is
// missing from a reading (a /proc/stat that numbers another set of
// processors) or no tick passed.
TEST(IdleProcessors, IdleSharesOfTheAllowedProcessors) {
    const ProcessorTicks before = ParseProcessorTicks(kStatBefore);
    const ProcessorTicks after = ParseProcessorTicks(kStatAfter);
    EXPECT_NEAR(IdleProcessors(before, after, {0, 1}, 0.0), 0.9, 1e-12);
    // cpu0 was busy with this process reading its model: free for its threads.
    EXPECT_NEAR(IdleProcessors(before, after, {0, 1}, 1.0), 1.9, 1e-12);
    EXPECT_NEAR(IdleProcessors(before, after, {1, 3}, 0.0), 1.9, 1e-12);
    // Never more than the processors: the own time counts threads that waited.
    EXPECT_NEAR(IdleProcessors(before, after, {0, 3}, 1.5), 2.0, 1e-12);
    EXPECT_LT(IdleProcessors(before, after, {0, 2}, 0.0), 0.0);
    EXPECT_LT(IdleProcessors(before, before, {0, 1}, 0.0), 0.0);
    EXPECT_LT(IdleProcessors(before, after, {}, 0.0), 0.0);
    EXPECT_LT(IdleProcessors(after, before, {0}, 0.0), 0.0);
}

// The restart that shortens the spin of waiting threads: only when the user set no
// wait policy, more than one thread may run, no launcher started the
// process, and it is not the restarted process itself.
TEST(Restart, OnlyWhenNoWaitPolicyIsSet) {
    std::map<std::string, std::string> env;
    const EnvLookup lookup = [&env](const char* name) -> const char* {
        const auto it = env.find(name);
        return it == env.end() ? nullptr : it->second.c_str();
    };
    const auto restart = RestartVariables(lookup, 2);
    ASSERT_EQ(restart.size(), 2u);
    EXPECT_EQ(restart[0],
              (std::pair<std::string, std::string>{"GOMP_SPINCOUNT", std::to_string(kSpinRounds)}));
    EXPECT_TRUE(RestartVariables(lookup, 1).empty());

    // The restarted process finds the mark and goes on.
    for (const auto& [name, value] : restart) env[name] = value;
    EXPECT_TRUE(RestartVariables(lookup, 2).empty());
    env.erase("GOMP_SPINCOUNT");
    EXPECT_TRUE(RestartVariables(lookup, 2).empty()) << "the mark alone stops a second restart";
    env.clear();

    for (const auto& [name, value] :
         std::map<std::string, std::string>{{"OMP_WAIT_POLICY", "active"},
                                            {"GOMP_SPINCOUNT", "10000"},
                                            {"OMP_NUM_THREADS", "1"},
                                            {"OMPI_COMM_WORLD_SIZE", "2"},
                                            {"PMI_RANK", "0"},
                                            {"PMIX_RANK", "0"}}) {
        env = {{name, value}};
        EXPECT_TRUE(RestartVariables(lookup, 2).empty()) << name;
    }
    env = {{"OMP_NUM_THREADS", "2"}};
    EXPECT_EQ(RestartVariables(lookup, 2).size(), 2u);
}

// The engine end to end on a basin of 11 x 11 points: what the log says of
// the threads with the environment left alone, with a wait policy of the
// user's and with OMP_NUM_THREADS.
class ThreadsOfARun : public testing::Test {
protected:
    bwtest::TempDir dir;
    void SetUp() override {
        if (!std::filesystem::is_regular_file(bwtest::BuiltProgram("bw")))
            GTEST_SKIP() << "the engine is not built";
        bwtest::MapSpec grid;
        std::vector<float> bed = bwtest::Constant(grid, -1.0f);
        for (int k = 0, p = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j, ++p)
                if (j == 0 || k == 0 || j == grid.J || k == grid.K) bed[p] = 1.0f;
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
        bwtest::WriteFile(
            dir / "m.bw",
            bwtest::ModelText("bed.xol2", {{"Simulation_Period",
                                            "Time_step_count = 5\nTime_step_interval = 0.1\n"
                                            "Warm_up_period = 0\n"
                                            "Start_time = 2004, 1, 1, 0, 0, 0\n"}}));
    }
    // The log of a run with the given variables set and the thread settings
    // of the environment the test runs in taken out.
    std::string Run(const std::map<std::string, std::string>& env) {
        std::map<std::string, std::string> all = env;
        all["TARN_PROGRESS"] = "NONE";
        std::vector<std::string> unset = {"BUILDMODE"};
        for (const char* name : {"OMP_WAIT_POLICY", "GOMP_SPINCOUNT", "OMP_NUM_THREADS"})
            if (!env.contains(name)) unset.push_back(name);
        const bwtest::RunResult r =
            bwtest::RunProgram({bwtest::BuiltProgram("bw"), "m.bw"}, dir.path.string(), all, unset);
        EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
        return bwtest::ReadFile(dir / "m.log");
    }
    static int Processors() {
        cpu_set_t set;
        CPU_ZERO(&set);
        return sched_getaffinity(0, sizeof set, &set) == 0 ? CPU_COUNT(&set) : 1;
    }
};

TEST_F(ThreadsOfARun, DefaultRestartsWithAShortSpinAndOneThreadOnASmallGrid) {
    const std::string log = Run({});
    EXPECT_NE(log.find("  Threads requested    : by grid size and idle processors\n"),
              std::string::npos)
        << log;
    // The restarted process ran the same model (this log) and found its mark.
    EXPECT_NE(log.find(Processors() > 1
                           ? "  Waiting threads      : spin " + std::to_string(kSpinRounds) +
                                 " rounds, then sleep (GOMP_SPINCOUNT, set by bw)\n"
                           : "  Waiting threads      : spin, then sleep (runtime's default)\n"),
              std::string::npos)
        << log;
    EXPECT_NE(log.find("  Threads in use       : 1 (grid too small to gain from more)\n"),
              std::string::npos)
        << log;
    EXPECT_NE(log.find("  Number of threads: 1\n"), std::string::npos) << log;
    // The lines of the block before the new ones are as they were.
    EXPECT_NE(log.find("  Max number of threads: "), std::string::npos);
    EXPECT_LT(log.find("  Max number of threads: "), log.find("  Threads requested    : "));
}

TEST_F(ThreadsOfARun, TheUsersSettingsStand) {
    std::string log = Run({{"OMP_WAIT_POLICY", "active"}});
    EXPECT_NE(log.find("  Waiting threads      : spin (OMP_WAIT_POLICY=active)\n"),
              std::string::npos)
        << log;
    log = Run({{"GOMP_SPINCOUNT", "500"}});
    EXPECT_NE(log.find("  Waiting threads      : spin 500 rounds, then sleep (GOMP_SPINCOUNT)\n"),
              std::string::npos)
        << log;

    log = Run({{"OMP_NUM_THREADS", "2"}});
    const std::string used =
        Processors() > 1 ? "2 (OMP_NUM_THREADS)" : "1 (OMP_NUM_THREADS=2, cut to 1 processor)";
    EXPECT_NE(log.find("  Threads requested    : 2 (OMP_NUM_THREADS)\n"), std::string::npos) << log;
    EXPECT_NE(log.find("  Threads in use       : " + used + "\n"), std::string::npos) << log;
    EXPECT_NE(log.find("  Number of threads: " + used.substr(0, 1) + "\n"), std::string::npos)
        << log;
}

}  // namespace
