// The engine as a user meets it: started from the command line on small
// model files, judged by its exit code, what it prints and its log.
#include <gtest/gtest.h>

#include <filesystem>
#include <regex>

#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;
using bwtest::RunResult;

namespace {

// A small complete model: a basin of 2 m water in a frame of land, still
// at the start, run for two steps without processes or outputs.
void WriteSmallModel(const bwtest::TempDir& dir, const std::string& name) {
    bwtest::MapSpec grid;
    grid.J = 8, grid.K = 6;
    std::vector<float> bed = bwtest::Constant(grid, 1.0f);
    for (int k = 1; k < grid.K; ++k)
        for (int j = 1; j < grid.J; ++j) bed[k * (grid.J + 1) + j] = -2.0f;
    bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
    bwtest::WriteFile(
        dir / name,
        bwtest::ModelText("bed.xol2", {{"BASIC_MODEL_PARAMETERS", "OPEN_LOG_FILE_AFTER_RUN = 0\n"},
                                       {"Simulation_Period",
                                        "Time_step_count = 2\nTime_step_interval = 0.1\n"
                                        "Start_time = 2004, 1, 1, 0, 0, 0\n"}}));
}

class EngineRun : public testing::Test {
protected:
    bwtest::TempDir dir;
    std::string bw = bwtest::BuiltProgram("bw");
    RunResult Run(std::vector<std::string> args, std::map<std::string, std::string> env = {}) {
        args.insert(args.begin(), bw);
        return bwtest::RunProgram(args, dir.path.string(), env,
                                  {"BUILDMODE", "TRF", "TARN_PROGRESS"});
    }
    std::string LastLine(const std::string& path) {
        auto lines = bwtest::ReadLines(path);
        while (!lines.empty() && lines.back().empty()) lines.pop_back();
        return lines.empty() ? "" : lines.back();
    }
};

TEST_F(EngineRun, ABadStartStopsWithItsMessage) {
    // Before a model file is open nothing is written: no log, no channel.
    for (auto args : {std::vector<std::string>{}, {"-debug"}, {"model.bw", "-debug:2"}}) {
        RunResult r = Run(args);
        EXPECT_EQ(r.exitCode, 1);
        EXPECT_EQ(r.out, "Usage: bw [//hud] [options] kvt-file\n");
    }
    RunResult r = Run({"absent.bw"});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "TARNEL BW: Unable to open absent.bw\n");
    EXPECT_TRUE(fs::is_empty(dir.path));

    // Once it is open, the stop also ends the log; a syntax error is given
    // by its line and column behind the parser's text.
    WriteSmallModel(dir, "m.bw");
    fs::create_directory(dir / "m._spi_");  // a folder where the channel should be
    const std::string syntax =
        "TARNEL_BOUSSINESQ_WAVE {\n  BASIC_MODEL_PARAMETERS {\n"
        "    NUMBER_OF_DIMENSIONS 2\n  }\n}\n";
    const struct {
        std::string file, text, out;  // out: a pattern of the whole output
    } cases[] = {{"t.bw", "OTHER_TARGET {\n}\n", "KVT target: TARNEL_BOUSSINESQ_WAVE not found\n"},
                 {"s.bw", "TARNEL_BOUSSINESQ_WAVE {\n}\n",
                  "KVT section: BASIC_MODEL_PARAMETERS not found\n"},
                 {"m.bw", "", "Unable to open Hud2 message file: m._spi_\n"},
                 {"bad.bw", syntax, "[^\n]+ near line 3 and colum 26 in file bad.bw\n"}};
    for (const auto& c : cases) {
        if (!c.text.empty()) bwtest::WriteFile(dir / c.file, c.text);
        r = Run({c.file});
        EXPECT_EQ(r.exitCode, 1) << c.out;
        EXPECT_TRUE(std::regex_match(r.out, std::regex(c.out))) << r.out;
        EXPECT_EQ(LastLine(dir / fs::path(c.file).replace_extension(".log").string()),
                  "Abnormal completion")
            << c.out;
    }
    // In a nightly build the text reaches the log only.
    r = Run({"bad.bw"}, {{"BUILDMODE", "NIGHT"}});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "");
    EXPECT_NE(bwtest::ReadFile(dir / "bad.log").find("near line 3"), std::string::npos);
}

TEST_F(EngineRun, AMinimalModelRunsToSuccessfulCompletion) {
    WriteSmallModel(dir, "harbour.bw");
    bwtest::WriteFile(dir / "harbour._kill_", "left over from an earlier run");
    RunResult r = Run({"harbour.bw"});
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_EQ(r.out, "Successful completion\n");
    // The log: date and time of the start, then its blocks in order.
    const std::string log = bwtest::ReadFile(dir / "harbour.log");
    EXPECT_TRUE(std::regex_search(log, std::regex("^ {60}20[0-9]{6}\n {60}[0-9]{6}\n")))
        << log.substr(0, 200);
    size_t at = 0;
    for (const char* expected :
         {"Computing Environment", "  Number of processes  : 1\n  Local process id     : -1\n",
          "Target: TARNEL_BOUSSINESQ_WAVE\n", " Overall Timings ", "  Pre-processing  ",
          " Performance ", "\n  Number of threads: "}) {
        at = log.find(expected, at);
        ASSERT_NE(at, std::string::npos) << expected;
    }
    EXPECT_EQ(LastLine(dir / "harbour.log"), "Successful completion");
    // The channel starts at nothing done; a kill file left over is removed, not obeyed.
    EXPECT_EQ(bwtest::ReadFile(dir / "harbour._spi_").rfind("PROGRE          0\n", 0), 0u);
    EXPECT_FALSE(fs::exists(dir / "harbour._kill_"));
}

TEST_F(EngineRun, UnderALauncherEachProcessWritesItsOwnFiles) {
    WriteSmallModel(dir, "basin.bw");
    const std::string mpirun = "/usr/bin/mpirun";
    ASSERT_TRUE(fs::exists(mpirun));
    RunResult r = bwtest::RunProgram({mpirun, "--oversubscribe", "-n", "2", bw, "basin.bw"},
                                     dir.path.string(),
                                     {{"OMPI_ALLOW_RUN_AS_ROOT", "1"},
                                      {"OMPI_ALLOW_RUN_AS_ROOT_CONFIRM", "1"},
                                      {"OMPI_MCA_btl", "self,vader"}},
                                     {"TARN_PROGRESS"});
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_FALSE(fs::exists(dir / "basin.log"));
    for (int p = 0; p < 2; ++p) {
        const std::string stem = dir / ("basin_p" + std::to_string(p));
        const std::string log = bwtest::ReadFile(stem + ".log");
        EXPECT_NE(log.find("  Number of processes  : 2\n  Local process id     : " +
                           std::to_string(p) + "\n"),
                  std::string::npos);
        EXPECT_EQ(LastLine(stem + ".log"), "Successful completion");
        EXPECT_TRUE(fs::exists(stem + "._spi_"));
    }
}

}  // namespace
