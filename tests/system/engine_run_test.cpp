// The engine as a user meets it: started from the command line on small
// model files, judged by its exit code, what it prints and its log.
#include <gtest/gtest.h>

#include <filesystem>
#include <regex>

#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;
using bwtest::ReadLines;
using bwtest::RunProgram;
using bwtest::RunResult;

namespace {

// A small complete model: a basin of 2 m water in a frame of land, still
// at the start, run for two steps without processes or outputs.
void WriteSmallModel(const bwtest::TempDir& dir, const std::string& name) {
    bwtest::MapSpec spec;
    spec.J = 8, spec.K = 6;
    std::vector<float> bed = bwtest::Constant(spec, -2.0f);
    for (int k = 0; k <= spec.K; ++k)
        for (int j = 0; j <= spec.J; ++j)
            if (j == 0 || j == spec.J || k == 0 || k == spec.K) bed[k * (spec.J + 1) + j] = 1.0f;
    bwtest::WriteMapFile(dir / "bed.xol2", spec, bed);
    bwtest::WriteFile(
        dir / name,
        "# A basin at rest.\n" +
            bwtest::ModelText("bed.xol2",
                              {{"BASIC_MODEL_PARAMETERS", "OPEN_LOG_FILE_AFTER_RUN = 0\n"},
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
        return RunProgram(args, dir.path.string(), env, {"BUILDMODE", "TRF", "TARN_PROGRESS"});
    }
    std::string LastLine(const std::string& path) {
        auto lines = ReadLines(path);
        while (!lines.empty() && lines.back().empty()) lines.pop_back();
        return lines.empty() ? "" : lines.back();
    }
};

TEST_F(EngineRun, WithoutAFileNameItShowsTheUsage) {
    for (auto args : {std::vector<std::string>{}, {"-debug"}, {"model.bw", "-debug:2"}}) {
        RunResult r = Run(args);
        EXPECT_EQ(r.exitCode, 1);
        EXPECT_EQ(r.out, "Usage: bw [//hud] [options] kvt-file\n");
    }
    EXPECT_TRUE(fs::is_empty(dir.path));  // no log, no channel
}

TEST_F(EngineRun, AMissingFileIsNamed) {
    RunResult r = Run({"absent.bw"});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "TARNEL BW: Unable to open absent.bw\n");
    EXPECT_TRUE(fs::is_empty(dir.path));  // neither a log nor a progress file
}

TEST_F(EngineRun, ASyntaxErrorGivesItsLineAndColumn) {
    bwtest::WriteFile(dir / "bad.bw",
                      "TARNEL_BOUSSINESQ_WAVE {\n  BASIC_MODEL_PARAMETERS {\n"
                      "    NUMBER_OF_DIMENSIONS 2\n  }\n}\n");
    RunResult r = Run({"bad.bw"});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_TRUE(
        std::regex_search(r.out, std::regex("^[^\n]+ near line 3 and colum 26 in file bad.bw\n$")))
        << r.out;
    EXPECT_EQ(LastLine(dir / "bad.log"), "Abnormal completion");

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

    const std::string log = bwtest::ReadFile(dir / "harbour.log");
    auto lines = ReadLines(dir / "harbour.log");
    ASSERT_GT(lines.size(), 10u);
    EXPECT_TRUE(std::regex_match(lines[0], std::regex(" {60}20[0-9]{6}")));
    EXPECT_TRUE(std::regex_match(lines[1], std::regex(" {60}[0-9]{6}")));
    const std::string echo = "\n\n\n" + std::string(70, '=') +
                             "\nTarget: TARNEL_BOUSSINESQ_WAVE\n\n\n\n"
                             "Section: BASIC_MODEL_PARAMETERS " +
                             std::string(38, '-') +
                             "\n    NUMBER_OF_DIMENSIONS : 2 (default)\n"
                             "    OPEN_LOG_FILE_AFTER_RUN : 0\n";
    for (const std::string& expected : std::vector<std::string>{
             echo,
             "  Number of processes  : 1\n  Local process id     : -1\n",
             " Overall Timings ",
             "  Pre-processing  ",
             "\n  Number of threads: ",
         })
        EXPECT_NE(log.find(expected), std::string::npos) << expected;
    EXPECT_LT(log.find("Computing Environment"), log.find("Target: "));
    EXPECT_LT(log.find("Overall Timings"), log.find("Performance"));
    EXPECT_EQ(LastLine(dir / "harbour.log"), "Successful completion");

    // The channel starts at nothing done; the time loop reports behind it.
    EXPECT_EQ(bwtest::ReadFile(dir / "harbour._spi_").rfind("PROGRE          0\n", 0), 0u);
    EXPECT_FALSE(fs::exists(dir / "harbour._kill_"));
}

TEST_F(EngineRun, MissingTargetOrSectionStopsTheRun) {
    bwtest::WriteFile(dir / "t.bw", "OTHER_TARGET {\n}\n");
    RunResult r = Run({"t.bw"});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "KVT target: TARNEL_BOUSSINESQ_WAVE not found\n");
    EXPECT_EQ(LastLine(dir / "t.log"), "Abnormal completion");

    bwtest::WriteFile(dir / "s.bw", "TARNEL_BOUSSINESQ_WAVE {\n}\n");
    r = Run({"s.bw"});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "KVT section: BASIC_MODEL_PARAMETERS not found\n");
}

TEST_F(EngineRun, AProgressChannelThatCannotBeMadeStopsTheRun) {
    WriteSmallModel(dir, "m.bw");
    fs::create_directory(dir / "m._spi_");  // a folder where the channel should be
    RunResult r = Run({"m.bw"});
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "Unable to open Hud2 message file: m._spi_\n");
    EXPECT_EQ(LastLine(dir / "m.log"), "Abnormal completion");
}

TEST_F(EngineRun, UnderALauncherEachProcessWritesItsOwnFiles) {
    WriteSmallModel(dir, "basin.bw");
    const std::string mpirun = "/usr/bin/mpirun";
    ASSERT_TRUE(fs::exists(mpirun));
    RunResult r =
        RunProgram({mpirun, "--oversubscribe", "-n", "2", bw, "basin.bw"}, dir.path.string(),
                   {{"OMPI_ALLOW_RUN_AS_ROOT", "1"},
                    {"OMPI_ALLOW_RUN_AS_ROOT_CONFIRM", "1"},
                    {"OMPI_MCA_btl", "self,vader"}},
                   {"TARN_PROGRESS"});
    ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_FALSE(fs::exists(dir / "basin.log"));
    for (int p = 0; p < 2; ++p) {
        const std::string stem = dir / ("basin_p" + std::to_string(p));
        const std::string log = bwtest::ReadFile(stem + ".log");
        EXPECT_NE(log.find("  Number of processes  : 2\n"), std::string::npos);
        EXPECT_NE(log.find("  Local process id     : " + std::to_string(p) + "\n"),
                  std::string::npos);
        EXPECT_EQ(LastLine(stem + ".log"), "Successful completion");
        EXPECT_TRUE(fs::exists(stem + "._spi_"));
    }
}

}  // namespace
