// The viewer: following a run's files, the drawn line, and the program
// itself against a scripted run.
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>
#include <tuple>

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

testing::AssertionResult Has(const std::string& text, const std::string& part) {
    if (text.find(part) != std::string::npos) return testing::AssertionSuccess();
    return testing::AssertionFailure() << "no \"" << part << "\" in:\n" << text;
}

// What the viewer knows: progress, date, message and records read.
using Known = std::tuple<int, std::string, std::string, int>;
Known Seen(const ViewState& s) {
    return {s.progress, s.status, s.message, s.records};
}

// Records are read as they are appended, an unended line waits for its end,
// a garbled record is passed over; a file re-created, or cut and rewritten
// beyond the old length, is read afresh from its start.
TEST(ViewerFollow, RecordsPartialLinesAndANewRunInTheSameFile) {
    bwtest::TempDir dir;
    RunFiles run = LocateRun(dir / "bay.bw");
    ViewState state;
    Append(run.messageFile, Progress(0) + "STATUS 2004-01-01 00:00:00\nMESSAG Time st");
    EXPECT_TRUE(PollMessageFile(run, state, 1.0));
    EXPECT_EQ(Seen(state), Known(0, "2004-01-01 00:00:00", "", 2));
    Append(run.messageFile, "ep: 40\r\nCOMSPD    1250000\nPROGRE   garbage\n" + Progress(400));
    EXPECT_TRUE(PollMessageFile(run, state, 2.0));
    EXPECT_EQ(Seen(state), Known(400, "2004-01-01 00:00:00", "Time step: 40", 5));
    EXPECT_EQ(state.speed, 1250000);

    fs::remove(run.messageFile);
    bwtest::WriteFile(run.messageFile, Progress(10) + "STALBL " + std::string(100, 'x') + "\n");
    EXPECT_TRUE(PollMessageFile(run, state, 4.0));
    EXPECT_EQ(Seen(state), Known(10, "", "", 2));
    // The same inode, a larger size: the new content is read from its start.
    bwtest::WriteFile(run.messageFile, "STATUS 2004-01-02 00:00:00\n" + Progress(20) + "STALBL " +
                                           std::string(100, 'y') + "\n");
    EXPECT_TRUE(PollMessageFile(run, state, 5.0));
    EXPECT_EQ(Seen(state), Known(20, "2004-01-02 00:00:00", "", 3));
}

// The end of a run is the last non-empty line of its log, however long. A
// message file newer than an ended log found at the start belongs to a run
// just begun: it is read from its start, and the old end does not count.
TEST(ViewerFollow, EndOfARunFromItsLog) {
    bwtest::TempDir dir;
    RunFiles run = LocateRun(dir / "bay.bw");
    bwtest::WriteFile(run.logFile, "Successful completion\nPerformance\n");
    EXPECT_EQ(ReadRunEnd(run.logFile), RunEnd::Running);
    std::string log;
    for (int i = 0; i < 100; ++i) log += "  Computing time, line " + std::to_string(i) + "\n";
    bwtest::WriteFile(run.logFile, log + "\nAbnormal completion\n\n  \n");
    EXPECT_EQ(ReadRunEnd(run.logFile), RunEnd::Abnormal);
    bwtest::WriteFile(run.messageFile, Progress(0));
    SetAge(run.logFile, 10);
    MarkLeftovers(run);
    ViewState state;
    EXPECT_TRUE(PollMessageFile(run, state, 0.0));
    EXPECT_EQ(state.progress, 0);
    EXPECT_EQ(CheckRunEnd(run), RunEnd::Running);
}

// The stem drops the later model extension and the last ".inp" (or ".log");
// a run without a launcher comes before leftovers of one under a launcher.
TEST(ViewerFollow, NamesOfTheFiles) {
    EXPECT_EQ(ChannelStem("a.bw.BW"), "a.bw");
    EXPECT_EQ(ChannelStem("x.inp.y.bw"), "x");
    EXPECT_EQ(LogName("dir.v2/bay", false), "dir.v2/bay.log");
    bwtest::TempDir dir;
    for (const char* name : {"m_p0._spi_", "m._spi_"}) bwtest::WriteFile(dir / name, "");
    const RunFiles run = LocateRun(dir / "m.bw");
    EXPECT_EQ(std::make_pair(run.logFile, KillFiles(run)),
              std::make_pair(dir / "m.log", std::vector<std::string>{dir / "m._kill_"}));
}

// The line never exceeds the width; what does not fit goes least needed
// first (speed, date, step), the bar shrinks; another message is cut.
TEST(ViewerRender, LineFitsTheWidthAndTellsTheTimeLeft) {
    ViewState state;
    state.progress = 500;
    state.status = "2004-01-01 01:00:00";
    state.message = "Time step: 1200";
    state.speed = 2500000;
    auto bar = [](int cells) {
        return "[" + std::string(cells / 2, '#') + std::string(cells - cells / 2, '-') + "] ";
    };
    const std::pair<int, std::string> lines[] = {
        {100, bar(36) + " 50.0%  2004-01-01 01:00:00  step 1200  2.50 Mpt/s  left 2:05"},
        {70, bar(18) + " 50.0%  2004-01-01 01:00:00  step 1200  left 2:05"},
        {60, bar(29) + " 50.0%  step 1200  left 2:05"},
        {12, " 50.0%"}};
    for (const auto& [width, line] : lines) EXPECT_EQ(RenderLine(state, 125.0, width, true), line);
    for (int width = 1; width <= 120; ++width)
        EXPECT_LE(RenderLine(state, 125.0, width, true).size(), static_cast<size_t>(width));

    state.message = "Run is cancelled by the user ...";
    EXPECT_EQ(RenderLine(state, -1.0, 60, false),
              " 50.0%  2004-01-01 01:00:00  2.50 Mpt/s  Run is cancelled by");
    state.progress = 1000;
    EXPECT_EQ(RenderLine(state, 0.0, 0, true).substr(0, 30), "[####################] 100.0% ");

    // The time left comes from the rate since progress was first seen moving,
    // counts down between reports, and starts again when progress goes back.
    state = ViewState{};
    ApplyRecord("PROGRE          0", state, 10.0);
    ApplyRecord("PROGRE        100", state, 10.0);
    EXPECT_LT(EstimateTimeLeft(state, 10.0), 0.0);  // no rate yet
    ApplyRecord("PROGRE        200", state, 20.0);
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 20.0), 80.0);  // 100 per mille in 10 s
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 200.0), 0.0);
    ApplyRecord("PROGRE        200", state, 30.0);  // the same value again is no change
    EXPECT_DOUBLE_EQ(EstimateTimeLeft(state, 30.0), 70.0);
    ApplyRecord("PROGRE         50", state, 40.0);
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

// In plain lines without terminal control: waiting, each new state, never
// the earlier run's records, the end; "n" or no answer lets the run go on.
TEST(ViewerProgram, FollowsARunToItsEndInPlainLines) {
    FakeRun fake;
    const std::string spi = fake.dir / "bay._spi_";
    const std::string log = fake.dir / "bay.log";
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
    const bwtest::RunResult r = fake.View("q\nn\nq\n");  // the input ends at the second question
    engine.join();
    EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
    EXPECT_FALSE(Has(r.out, "step 77"));
    EXPECT_EQ(r.out.rfind("Waiting for the run of bay.bw ...\n  0.0%\n", 0), 0u) << r.out;
    EXPECT_TRUE(Has(r.out, "Cancel the run of bay.bw? [y/N] n\nThe run goes on.\n"));
    EXPECT_TRUE(Has(r.out, "[y/N] (no answer)\nThe run goes on.\n"));
    EXPECT_TRUE(Has(r.out, " 50.0%  2004-01-01 00:05:00  step 300  left "));
    EXPECT_TRUE(Has(r.out, "\n100.0%  2004-01-01 00:10:00  step 600\nRun ended: Successful"));
    EXPECT_EQ(r.out.find_first_of("\033\r"), std::string::npos);
}

// Under a launcher "y" creates a kill file for every process (in the order
// of their numbers, files of other names passed over), and the run's
// abnormal end ends the viewer with code 1.
TEST(ViewerProgram, CancelReachesEveryProcess) {
    FakeRun fake;
    std::thread engine([&] {
        for (const char* name : {"bay_p10._spi_", "bay_p2._spi_", "bay_px._spi_", "bayy_p3._spi_"})
            bwtest::WriteFile(fake.dir / name, Progress(0));
        bwtest::WriteFile(fake.dir / "bay_p0._spi_", Progress(0));
        bool killed = false;
        for (int step = 1; step <= 40 && !killed; ++step) {
            std::this_thread::sleep_for(50ms);
            Append(fake.dir / "bay_p0._spi_", "MESSAG Time step: 1\n" + Progress(step * 25));
            killed = fs::exists(fake.dir / "bay_p10._kill_");
        }
        bwtest::WriteFile(fake.dir / "bay_p0.log",
                          killed ? "Abnormal completion\n" : "Successful completion\n");
    });
    const bwtest::RunResult r = fake.View("q\ny\n");
    engine.join();
    EXPECT_EQ(r.exitCode, 1) << r.out;
    EXPECT_TRUE(Has(r.out,
                    "Cancel the run of bay.bw? [y/N] y\n"
                    "Cancel requested: created bay_p0._kill_, bay_p2._kill_, bay_p10._kill_\n"));
    EXPECT_TRUE(Has(r.out, "Run ended: Abnormal completion\n"));
}

// A mistake on the command line is named, with the usage, and exit code 2.
TEST(ViewerProgram, CommandLineMistakesAreNamed) {
    FakeRun fake;
    const std::string viewer = bwtest::BuiltProgram("bwview");
    const std::pair<std::vector<std::string>, std::string> cases[] = {
        {{viewer}, "bwview: no model file given\n"},
        {{viewer, "bay.bw", "--interval"}, "bwview: --interval needs a number of seconds\n"},
        {{viewer, "--interval=0", "bay.bw"}, "not '0'"},
        {{viewer, "--colour", "bay.bw"}, "bwview: unknown option --colour\n"},
        {{viewer, "bay.bw", "other.bw"}, "one model file only"},
        {{viewer, "bya.bw"}, "bwview: bya.bw: no such file\n"},
    };
    for (const auto& [argv, text] : cases) {
        const bwtest::RunResult r = bwtest::RunProgram(argv, fake.dir.path.string());
        EXPECT_EQ(r.exitCode, 2) << text;
        EXPECT_TRUE(Has(r.err, text));
        EXPECT_TRUE(Has(r.err, "Usage: bwview [--interval SECONDS] MODEL.bw"));
    }
    const bwtest::RunResult help = bwtest::RunProgram({viewer, "--help"}, fake.dir.path.string());
    EXPECT_EQ(help.exitCode, 0);
    EXPECT_EQ(help.out.rfind("Usage: bwview", 0), 0u);
}

}  // namespace
