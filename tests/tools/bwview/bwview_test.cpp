#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "bwview/follow.hpp"
#include "bwview/render.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

void Append(const std::string& path, const std::string& text) {
    FILE* f = std::fopen(path.c_str(), "a");
    std::fputs(text.c_str(), f);
    std::fclose(f);
}

TEST(ViewerFollow, RecordsPartialLinesAndARecreatedFile) {
    bwtest::TempDir dir;
    const std::string model = dir / "bay.bw";
    RunFiles run = LocateRun(model);
    EXPECT_EQ(run.messageFile, dir / "bay._spi_");
    EXPECT_EQ(run.logFile, dir / "bay.log");
    ViewState state;
    EXPECT_FALSE(PollMessageFile(run, state));  // no file yet

    Append(run.messageFile, "PROGRE          0\nSTATUS 2004-01-01 00:00:00\nMESSAG Time st");
    EXPECT_TRUE(PollMessageFile(run, state));
    EXPECT_EQ(state.progress, 0);
    EXPECT_EQ(state.status, "2004-01-01 00:00:00");
    EXPECT_EQ(state.message, "");  // the line is not ended yet
    Append(run.messageFile, "ep: 40\nCOMSPD    1250000\nPROGRE        400\n");
    EXPECT_TRUE(PollMessageFile(run, state));
    EXPECT_EQ(state.message, "Time step: 40");
    EXPECT_EQ(state.speed, 1250000);
    EXPECT_EQ(state.progress, 400);

    // A new run re-creates the file: what was known of the old one is gone.
    fs::remove(run.messageFile);
    bwtest::WriteFile(run.messageFile, "PROGRE         10\n");
    EXPECT_TRUE(PollMessageFile(run, state));
    EXPECT_EQ(state.progress, 10);
    EXPECT_EQ(state.message, "");
    EXPECT_FALSE(ApplyRecord("NOTAG  x", state));
}

TEST(ViewerFollow, EndOfRunAndTheFilesOfALauncher) {
    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "a.log", "x\nSuccessful completion\n\n");
    bwtest::WriteFile(dir / "b.log", "x\nAbnormal completion\n");
    bwtest::WriteFile(dir / "c.log", "Run is cancelled by the user ...\n");
    EXPECT_EQ(ReadRunEnd(dir / "a.log"), RunEnd::Successful);
    EXPECT_EQ(ReadRunEnd(dir / "b.log"), RunEnd::Abnormal);
    EXPECT_EQ(ReadRunEnd(dir / "c.log"), RunEnd::Running);
    EXPECT_EQ(ReadRunEnd(dir / "none.log"), RunEnd::Running);

    bwtest::WriteFile(dir / "m_p0._spi_", "");
    bwtest::WriteFile(dir / "m_p1._spi_", "");
    RunFiles run = LocateRun(dir / "m.BW");
    EXPECT_EQ(run.messageFile, dir / "m_p0._spi_");
    EXPECT_EQ(run.logFile, dir / "m_p0.log");
    EXPECT_EQ(KillFiles(run), (std::vector<std::string>{dir / "m_p0._kill_", dir / "m_p1._kill_"}));
}

TEST(ViewerRender, LineFitsTheWidthAndEstimatesTimeLeft) {
    ViewState state;
    state.progress = 500;
    state.status = "2004-01-01 01:00:00";
    state.message = "Time step: 1200";
    state.speed = 2500000;
    const std::string line = RenderLine(state, 125.0, 100, true);
    EXPECT_EQ(line,
              "[###############---------------]  50.0%  2004-01-01 01:00:00  step 1200  "
              "2.50 Mpt/s  left 2:05");
    EXPECT_EQ(RenderLine(state, 125.0, 40, true).size(), 40u);
    EXPECT_EQ(RenderLine(state, -1.0, 0, false),
              " 50.0%  2004-01-01 01:00:00  step 1200  2.50 Mpt/s");

    RateTracker tracker;
    state.progress = 100;
    EXPECT_LT(EstimateTimeLeft(state, 10.0, tracker), 0.0);  // no rate yet
    state.progress = 200;
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 20.0, tracker), 80.0);  // 100 per mille in 10 s
    EXPECT_EQ(FormatDuration(3725), "1:02:05");
}

TEST(ViewerProgram, FollowsARunToItsEndInPlainLines) {
    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "bay.log", "Successful completion\n");  // left by an earlier run
    std::thread run([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        bwtest::WriteFile(dir / "bay._spi_", "PROGRE          0\n");
        bwtest::WriteFile(dir / "bay.log", "log of the new run\n");
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        Append(dir / "bay._spi_",
               "STATUS 2004-01-01 00:10:00\nMESSAG Time step: 600\nPROGRE       1000\n");
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        Append(dir / "bay.log", "\nSuccessful completion\n");
    });
    auto r = bwtest::RunProgram({bwtest::BuiltProgram("bwview"), "--interval", "0.05", "bay.bw"},
                                dir.path.string());
    run.join();
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_NE(r.out.find("Waiting for the run of bay.bw ...\n"), std::string::npos);
    EXPECT_NE(r.out.find("\n  0.0%\n"), std::string::npos) << r.out;
    EXPECT_NE(r.out.find("100.0%  2004-01-01 00:10:00  step 600\n"), std::string::npos) << r.out;
    EXPECT_EQ(r.out.substr(r.out.size() - 33), "Run ended: Successful completion\n");
    EXPECT_EQ(r.out.find('\033'), std::string::npos);  // no terminal control in plain lines
}

TEST(ViewerProgram, CancelCreatesTheKillFile) {
    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "bay._spi_", "PROGRE        100\n");
    std::thread engine([&] {
        // The engine's side: once the kill file is there, the run ends.
        for (int i = 0; i < 200 && !fs::exists(dir / "bay._kill_"); ++i)
            std::this_thread::sleep_for(std::chrono::milliseconds(25));
        bwtest::WriteFile(dir / "bay.log",
                          "Run is cancelled by the user ...\n\nAbnormal completion\n");
    });
    auto r = bwtest::RunProgramWithInput(
        {bwtest::BuiltProgram("bwview"), "--interval", "0.05", "bay.bw"}, dir.path.string(),
        "q\ny\n");
    engine.join();
    EXPECT_TRUE(fs::exists(dir / "bay._kill_"));
    EXPECT_EQ(r.exitCode, 1) << r.out;
    EXPECT_NE(r.out.find("Cancel the run of bay.bw? [y/N]"), std::string::npos);
    EXPECT_NE(r.out.find("Run ended: Abnormal completion"), std::string::npos);

    auto usage = bwtest::RunProgram({bwtest::BuiltProgram("bwview")}, dir.path.string());
    EXPECT_EQ(usage.exitCode, 2);
    EXPECT_NE(usage.err.find("no model file given"), std::string::npos);
}

}  // namespace
