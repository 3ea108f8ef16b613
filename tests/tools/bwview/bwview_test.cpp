// The viewer: reading the message file as a run writes it, the end of a run,
// the drawn line, and the program itself against a scripted run.
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "bwview/follow.hpp"
#include "bwview/render.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;
using namespace std::chrono_literals;

namespace {

void Append(const std::string& path, const std::string& text) {
    FILE* f = std::fopen(path.c_str(), "a");
    ASSERT_NE(f, nullptr) << path;
    std::fputs(text.c_str(), f);
    std::fclose(f);
}

// A record as the engine writes it: integers right-aligned in 10 columns.
std::string Progress(int perMille) {
    char text[32];
    std::snprintf(text, sizeof text, "PROGRE %10d\n", perMille);
    return text;
}

void SetAge(const std::string& path, int secondsAgo) {
    fs::last_write_time(path, fs::file_time_type::clock::now() - std::chrono::seconds(secondsAgo));
}

TEST(ViewerFollow, RecordsPartialLinesAndANewRunInTheSameFile) {
    bwtest::TempDir dir;
    RunFiles run = LocateRun(dir / "bay.bw");
    ViewState state;
    EXPECT_FALSE(PollMessageFile(run, state, 0.0));  // no file yet

    Append(run.messageFile, Progress(0) + "STATUS 2004-01-01 00:00:00\nMESSAG Time st");
    EXPECT_TRUE(PollMessageFile(run, state, 1.0));
    EXPECT_EQ(state.progress, 0);
    EXPECT_EQ(state.status, "2004-01-01 00:00:00");
    EXPECT_EQ(state.message, "");  // the line is not ended yet
    Append(run.messageFile, "ep: 40\r\nCOMSPD    1250000\nPROGRE   garbage\n" + Progress(400));
    EXPECT_TRUE(PollMessageFile(run, state, 2.0));
    EXPECT_EQ(state.message, "Time step: 40");
    EXPECT_EQ(state.speed, 1250000);
    EXPECT_EQ(state.progress, 400);  // the garbled record is passed over
    EXPECT_EQ(state.records, 5);
    EXPECT_FALSE(PollMessageFile(run, state, 3.0));  // nothing new

    // Re-created under the same name, longer than before: what was known of
    // the old run is gone.
    fs::remove(run.messageFile);
    bwtest::WriteFile(run.messageFile, Progress(10) + "STALBL " + std::string(100, 'x') + "\n");
    EXPECT_TRUE(PollMessageFile(run, state, 4.0));
    EXPECT_EQ(state.progress, 10);
    EXPECT_EQ(state.message, "");
    EXPECT_EQ(state.records, 2);

    // Cut short and written again beyond the old length between two looks
    // (the same inode, a larger size): the new content is read from its start.
    bwtest::WriteFile(run.messageFile, "STATUS 2004-01-02 00:00:00\n" + Progress(20) + "STALBL " +
                                           std::string(100, 'y') + "\n");
    EXPECT_TRUE(PollMessageFile(run, state, 5.0));
    EXPECT_EQ(state.status, "2004-01-02 00:00:00");
    EXPECT_EQ(state.records, 3);
    EXPECT_EQ(state.progress, 20);

    // Cut to nothing, then the first record of the next run.
    bwtest::WriteFile(run.messageFile, "");
    PollMessageFile(run, state, 6.0);
    EXPECT_EQ(state.records, 0);
    Append(run.messageFile, Progress(0));
    EXPECT_TRUE(PollMessageFile(run, state, 7.0));
    EXPECT_EQ(state.progress, 0);
}

TEST(ViewerFollow, EndOfARunFromItsLog) {
    bwtest::TempDir dir;
    std::string longLog;
    for (int i = 0; i < 100; ++i) longLog += "  Computing time, line " + std::to_string(i) + "\n";
    bwtest::WriteFile(dir / "a.log", longLog + "\nSuccessful completion\n\n  \n");
    bwtest::WriteFile(dir / "b.log", "Fatal error: x\nAbnormal completion");
    bwtest::WriteFile(dir / "c.log", "Run is cancelled by the user ...\n");
    bwtest::WriteFile(dir / "d.log", "Successful completion\nPerformance\n");
    EXPECT_EQ(ReadRunEnd(dir / "a.log"), RunEnd::Successful);
    EXPECT_EQ(ReadRunEnd(dir / "b.log"), RunEnd::Abnormal);
    EXPECT_EQ(ReadRunEnd(dir / "c.log"), RunEnd::Running);
    EXPECT_EQ(ReadRunEnd(dir / "d.log"), RunEnd::Running);  // only the last line counts
    EXPECT_EQ(ReadRunEnd(dir / "none.log"), RunEnd::Running);
}

TEST(ViewerFollow, FilesLeftByAnEarlierRunAreNotTakenForTheNextOne) {
    bwtest::TempDir dir;
    RunFiles run = LocateRun(dir / "bay.bw");
    bwtest::WriteFile(run.messageFile, Progress(0) + "MESSAG Time step: 900\n" + Progress(1000));
    bwtest::WriteFile(run.logFile, "old log\nSuccessful completion\n");
    SetAge(run.messageFile, 20);
    SetAge(run.logFile, 10);
    MarkLeftovers(run);
    ViewState state;
    EXPECT_FALSE(PollMessageFile(run, state, 0.0));
    EXPECT_EQ(state.records, 0);
    EXPECT_EQ(CheckRunEnd(run), RunEnd::Running);

    // The next run rewrites the log, then the message file.
    bwtest::WriteFile(run.logFile, "new log\n");
    EXPECT_EQ(CheckRunEnd(run), RunEnd::Running);
    bwtest::WriteFile(run.messageFile, Progress(0));
    EXPECT_TRUE(PollMessageFile(run, state, 1.0));
    EXPECT_EQ(state.progress, 0);
    EXPECT_EQ(state.message, "");
    Append(run.logFile, "\nAbnormal completion\n");
    EXPECT_EQ(CheckRunEnd(run), RunEnd::Abnormal);

    // A message file newer than the ended log belongs to a run that has just
    // begun and not yet rewritten its log: it is read from its start.
    RunFiles next = LocateRun(dir / "bay.bw");
    SetAge(next.logFile, 10);
    MarkLeftovers(next);
    ViewState fresh;
    EXPECT_TRUE(PollMessageFile(next, fresh, 0.0));
    EXPECT_EQ(fresh.progress, 0);
    EXPECT_EQ(CheckRunEnd(next), RunEnd::Running);
}

TEST(ViewerFollow, NamesOfTheFilesAlsoUnderALauncher) {
    EXPECT_EQ(ChannelStem("dir/bay.bw"), "dir/bay");
    EXPECT_EQ(ChannelStem("a.bw.BW"), "a.bw");  // the later of the two
    EXPECT_EQ(ChannelStem("run.log.bw"), "run");
    EXPECT_EQ(ChannelStem("x.inp.y.bw"), "x");
    EXPECT_EQ(ChannelStem("plain"), "plain");
    EXPECT_EQ(LogName("dir.v2/bay.bw", false), "dir.v2/bay.log");
    EXPECT_EQ(LogName("dir.v2/bay", false), "dir.v2/bay.log");
    EXPECT_EQ(LogName("bay.BW", true), "bay_p0.log");

    bwtest::TempDir dir;
    for (const char* name :
         {"m_p0._spi_", "m_p1._spi_", "m_p10._spi_", "m_px._spi_", "mm_p3._spi_"})
        bwtest::WriteFile(dir / name, "");
    RunFiles run = LocateRun(dir / "m.bw");
    EXPECT_TRUE(run.perProcess);
    EXPECT_EQ(run.messageFile, dir / "m_p0._spi_");
    EXPECT_EQ(run.logFile, dir / "m_p0.log");
    EXPECT_EQ(KillFiles(run), (std::vector<std::string>{dir / "m_p0._kill_", dir / "m_p1._kill_",
                                                        dir / "m_p10._kill_"}));
    // A file of a single process wins over those of a launcher.
    bwtest::WriteFile(dir / "m._spi_", "");
    run = LocateRun(dir / "m.bw");
    EXPECT_FALSE(run.perProcess);
    EXPECT_EQ(run.logFile, dir / "m.log");
    EXPECT_EQ(KillFiles(run), std::vector<std::string>{dir / "m._kill_"});
}

TEST(ViewerRender, LineFitsTheWidthLeastNeededPartsFirstOut) {
    ViewState state;
    state.progress = 500;
    state.status = "2004-01-01 01:00:00";
    state.message = "Time step: 1200";
    state.speed = 2500000;
    const std::string all = " 50.0%  2004-01-01 01:00:00  step 1200  2.50 Mpt/s  left 2:05";
    // The bar takes what the rest leaves, half full.
    EXPECT_EQ(RenderLine(state, 125.0, 100, true),
              "[" + std::string(18, '#') + std::string(18, '-') + "] " + all);
    // Narrower: the speed goes first, then the date, then the step.
    EXPECT_EQ(RenderLine(state, 125.0, 70, true),
              "[" + std::string(9, '#') + std::string(9, '-') + "] " +
                  " 50.0%  2004-01-01 01:00:00  step 1200  left 2:05");
    EXPECT_EQ(RenderLine(state, 125.0, 60, true),
              "[" + std::string(14, '#') + std::string(15, '-') + "]  50.0%  step 1200  left 2:05");
    EXPECT_EQ(RenderLine(state, 125.0, 40, true),
              "[" + std::string(10, '#') + std::string(10, '-') + "]  50.0%  left 2:05");
    EXPECT_EQ(RenderLine(state, 125.0, 12, true), " 50.0%");
    EXPECT_EQ(RenderLine(state, -1.0, 0, false),
              " 50.0%  2004-01-01 01:00:00  step 1200  2.50 Mpt/s");
    for (int width = 1; width <= 120; ++width)
        EXPECT_LE(RenderLine(state, 125.0, width, true).size(), static_cast<size_t>(width));

    // Another message stands last and is cut rather than left out.
    state.message = "Run is cancelled by the user ...";
    EXPECT_EQ(RenderLine(state, -1.0, 0, false),
              " 50.0%  2004-01-01 01:00:00  2.50 Mpt/s  Run is cancelled by the user ...");
    EXPECT_EQ(RenderLine(state, -1.0, 60, false),
              " 50.0%  2004-01-01 01:00:00  2.50 Mpt/s  Run is cancelled by");
    state.progress = 1000;
    EXPECT_EQ(RenderLine(state, 0.0, 0, true).substr(0, 30), "[####################] 100.0% ");
}

TEST(ViewerRender, TimeLeftFromTheRateSinceProgressWasFirstSeen) {
    ViewState state;
    // The first look finds a run under way: all it reads is one starting point.
    ApplyRecord("PROGRE          0", state, 10.0);
    ApplyRecord("PROGRE        100", state, 10.0);
    EXPECT_LT(EstimateTimeLeft(state, 10.0), 0.0);  // no rate yet
    ApplyRecord("PROGRE        200", state, 20.0);
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 20.0), 80.0);  // 100 per mille in 10 s
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 25.0), 75.0);  // counts down between reports
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 200.0), 0.0);
    ApplyRecord("PROGRE        200", state, 30.0);  // the same value again is no change
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 30.0), 70.0);
    ApplyRecord("PROGRE         50", state, 40.0);  // gone back: a new run, a new rate
    EXPECT_LT(EstimateTimeLeft(state, 40.0), 0.0);
    ApplyRecord("PROGRE       1000", state, 50.0);
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 50.0), 0.0);
    EXPECT_EQ(FormatDuration(59.4), "59s");
    EXPECT_EQ(FormatDuration(3725), "1:02:05");
    EXPECT_EQ(FormatSpeed(9999), "9999 pt/s");
    EXPECT_EQ(FormatSpeed(12345), "12.3 kpt/s");
}

// The viewer against a scripted run in a folder of its own.
struct FakeRun {
    bwtest::TempDir dir;
    FakeRun() { bwtest::WriteFile(dir / "bay.bw", "TARNEL_BOUSSINESQ_WAVE\n"); }
    bwtest::RunResult View(const std::string& input) {
        return bwtest::RunProgramWithInput(
            {bwtest::BuiltProgram("bwview"), "--interval", "0.05", "bay.bw"}, dir.path.string(),
            input);
    }
};

TEST(ViewerProgram, FollowsARunToItsEndInPlainLines) {
    FakeRun fake;
    const std::string spi = fake.dir / "bay._spi_";
    const std::string log = fake.dir / "bay.log";
    // Left by an earlier run.
    bwtest::WriteFile(spi, Progress(0) + "MESSAG Time step: 77\n" + Progress(1000));
    bwtest::WriteFile(log, "Successful completion\n");
    SetAge(spi, 20);
    SetAge(log, 10);
    std::thread engine([&] {
        std::this_thread::sleep_for(300ms);
        bwtest::WriteFile(log, "log of the new run\n");
        bwtest::WriteFile(spi, Progress(0));
        std::this_thread::sleep_for(300ms);
        Append(spi, "STATUS 2004-01-01 00:05:00\nMESSAG Time step: 300\n" + Progress(500));
        std::this_thread::sleep_for(300ms);
        Append(spi, "STATUS 2004-01-01 00:10:00\nMESSAG Time step: 600\n" + Progress(1000));
        std::this_thread::sleep_for(300ms);
        Append(log, "\nSuccessful completion\n");
    });
    const bwtest::RunResult r = fake.View("");
    engine.join();
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_EQ(r.out.find("step 77"), std::string::npos) << r.out;
    EXPECT_EQ(r.out.rfind("Waiting for the run of bay.bw ...\n  0.0%\n", 0), 0u) << r.out;
    EXPECT_NE(r.out.find(" 50.0%  2004-01-01 00:05:00  step 300  left "), std::string::npos)
        << r.out;
    EXPECT_NE(
        r.out.find("\n100.0%  2004-01-01 00:10:00  step 600\nRun ended: Successful completion\n"),
        std::string::npos)
        << r.out;
    EXPECT_EQ(r.out.find('\033'), std::string::npos);  // no terminal control in plain lines
    EXPECT_EQ(r.out.find('\r'), std::string::npos);
}

TEST(ViewerProgram, CancelCreatesTheKillFileOnYesOnly) {
    FakeRun fake;
    const std::string spi = fake.dir / "bay._spi_";
    // The engine's side: it ends the run when the kill file comes, or after 40 steps.
    auto engine = [&] {
        bwtest::WriteFile(spi, Progress(0));
        bool killed = false;
        for (int step = 1; step <= 40 && !killed; ++step) {
            std::this_thread::sleep_for(50ms);
            Append(spi, "MESSAG Time step: " + std::to_string(step) + "\n" + Progress(step * 25));
            killed = fs::exists(fake.dir / "bay._kill_");
        }
        bwtest::WriteFile(fake.dir / "bay.log", killed ? "Run is cancelled by the user ...\n\n"
                                                         "Abnormal completion\n"
                                                       : "\nSuccessful completion\n");
    };
    std::thread run(engine);
    bwtest::RunResult r = fake.View("q\ny\n");
    run.join();
    EXPECT_TRUE(fs::exists(fake.dir / "bay._kill_"));
    EXPECT_EQ(r.exitCode, 1) << r.out;
    EXPECT_NE(
        r.out.find("Cancel the run of bay.bw? [y/N] y\nCancel requested: created bay._kill_\n"),
        std::string::npos)
        << r.out;
    EXPECT_NE(r.out.find("Run ended: Abnormal completion\n"), std::string::npos);

    fs::remove(fake.dir / "bay._kill_");
    fs::remove(fake.dir / "bay.log");
    run = std::thread(engine);
    r = fake.View("q\nn\nq\n");  // the input ends while the second question is open
    run.join();
    EXPECT_FALSE(fs::exists(fake.dir / "bay._kill_"));
    EXPECT_EQ(r.exitCode, 0) << r.out;
    EXPECT_NE(r.out.find("[y/N] n\nThe run goes on.\n"), std::string::npos) << r.out;
    EXPECT_NE(r.out.find("[y/N] (no answer)\nThe run goes on.\n"), std::string::npos) << r.out;
}

TEST(ViewerProgram, CancelUnderALauncherReachesEveryProcess) {
    FakeRun fake;
    bwtest::WriteFile(fake.dir / "bay_p1._spi_", Progress(0));
    bwtest::WriteFile(fake.dir / "bay_p0._spi_", Progress(0));
    std::thread engine([&] {
        for (int i = 0; i < 200 && !fs::exists(fake.dir / "bay_p1._kill_"); ++i)
            std::this_thread::sleep_for(25ms);
        bwtest::WriteFile(fake.dir / "bay_p0.log", "Abnormal completion\n");
    });
    const bwtest::RunResult r = fake.View("q\ny\n");
    engine.join();
    EXPECT_EQ(r.exitCode, 1) << r.out;
    EXPECT_TRUE(fs::exists(fake.dir / "bay_p0._kill_"));
    EXPECT_TRUE(fs::exists(fake.dir / "bay_p1._kill_"));
    EXPECT_FALSE(fs::exists(fake.dir / "bay._kill_"));
}

TEST(ViewerProgram, CommandLineMistakesAreNamed) {
    FakeRun fake;
    const std::string viewer = bwtest::BuiltProgram("bwview");
    const std::string cwd = fake.dir.path.string();
    const std::pair<std::vector<std::string>, std::string> cases[] = {
        {{viewer}, "bwview: no model file given\n"},
        {{viewer, "bay.bw", "--interval"}, "bwview: --interval needs a number of seconds\n"},
        {{viewer, "--interval", "0", "bay.bw"}, "not '0'"},
        {{viewer, "--interval=2s", "bay.bw"}, "not '2s'"},
        {{viewer, "--colour", "bay.bw"}, "bwview: unknown option --colour\n"},
        {{viewer, "bay.bw", "other.bw"}, "one model file only"},
        {{viewer, "bya.bw"}, "bwview: bya.bw: no such file\n"},
    };
    for (const auto& [argv, text] : cases) {
        const bwtest::RunResult r = bwtest::RunProgram(argv, cwd);
        EXPECT_EQ(r.exitCode, 2) << text;
        EXPECT_NE(r.err.find(text), std::string::npos) << r.err;
        EXPECT_NE(r.err.find("Usage: bwview [--interval SECONDS] MODEL.bw"), std::string::npos);
    }
    const bwtest::RunResult help = bwtest::RunProgram({viewer, "--help"}, cwd);
    EXPECT_EQ(help.exitCode, 0);
    EXPECT_EQ(help.out.rfind("Usage: bwview", 0), 0u);
}

}  // namespace
