// bwview MODEL.bw: follows a run of bw and cancels it on request.
//
// On a terminal it keeps one live line (progress bar, percent, simulation
// date and time, time step, speed, time left, message) and reads single
// keys: q or Ctrl-C asks whether to cancel the run. When its output is no
// terminal it writes a plain line whenever the progress changes; when its
// input is no terminal it reads whole lines ("q", then "y" or "n"), taken
// only once the run has started. It ends when the run's log ends.
//
// Exit codes: 0 the run ended with "Successful completion", 1 with "Abnormal
// completion", 2 a wrong command line, 3 the viewer was left before the end.
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>

#include "bwview/follow.hpp"
#include "bwview/render.hpp"
#include "bwview/terminal.hpp"

namespace {

constexpr int kExitSuccessful = 0;
constexpr int kExitAbnormal = 1;
constexpr int kExitUsage = 2;
constexpr int kExitLeft = 3;

const char* const kUsage = "Usage: bwview [--interval SECONDS] MODEL.bw\n";

void Help() {
    std::printf(
        "%s"
        "Follows the run of MODEL.bw through its message file (MODEL._spi_) and shows\n"
        "its progress, simulation time, time step, speed and the time left.\n"
        "  --interval SECONDS  how often the files are read (default 0.5)\n"
        "Keys: q or Ctrl-C asks whether to cancel the run (y creates MODEL._kill_);\n"
        "Ctrl-C at the question leaves the viewer and lets the run go on.\n"
        "Without a terminal on standard input it reads the lines \"q\" and \"y\" or \"n\".\n"
        "Ends when the run's log ends: exit code 0 for \"Successful completion\",\n"
        "1 for \"Abnormal completion\", 3 when left before the end.\n",
        kUsage);
}

int UsageError(const std::string& text) {
    std::fprintf(stderr, "bwview: %s\n%s", text.c_str(), kUsage);
    return kExitUsage;
}

double WallNow() {
    timespec ts{};
    clock_gettime(CLOCK_MONOTONIC, &ts);
    return static_cast<double>(ts.tv_sec) + 1e-9 * static_cast<double>(ts.tv_nsec);
}

// Where the lines go: one line kept up to date on a terminal, else plain lines.
struct Screen {
    bool live = false;
    FILE* prompts = stdout;  // the questions go where the user sees them
    std::string lastPlain;   // what decided the last plain line

    void Live(const std::string& line) {
        std::printf("\r\033[K%s", line.c_str());
        std::fflush(stdout);
    }
    // A line of its own; on a terminal the live line is drawn again below it.
    void Say(const std::string& text) {
        std::printf("%s%s\n", live ? "\r\033[K" : "", text.c_str());
        std::fflush(stdout);
    }
    void Ask(const std::string& question) {
        if (live && prompts == stdout) std::fputs("\r\033[K", stdout);
        std::fputs(question.c_str(), prompts);
        std::fflush(prompts);
    }
    void Answered(const std::string& answer) {
        if (live && prompts == stdout)
            std::fputs("\r\033[K", stdout);
        else
            std::fprintf(prompts, "%s\n", answer.c_str());
        std::fflush(prompts);
    }
};

std::string PlainKey(const ViewState& state) {
    const bool step = state.message.rfind("Time step: ", 0) == 0;
    return std::to_string(state.progress) + "|" + (step ? "" : state.message);
}

void Draw(Screen& screen, const ViewState& state, const std::string& waiting, double now) {
    if (state.records == 0) {
        if (screen.live) {
            screen.Live(waiting.substr(0, static_cast<size_t>(std::max(TerminalWidth() - 1, 0))));
        } else if (screen.lastPlain.empty()) {
            screen.Say(waiting);
            screen.lastPlain = "waiting";
        }
        return;
    }
    const double left = EstimateTimeLeft(state, now);
    if (screen.live) {
        screen.Live(RenderLine(state, left, TerminalWidth() - 1, true));
    } else if (PlainKey(state) != screen.lastPlain) {
        screen.Say(RenderLine(state, left, 0, false));
        screen.lastPlain = PlainKey(state);
    }
}

bool CreateKillFiles(const RunFiles& run, Screen& screen) {
    bool all = true;
    std::string made;
    for (const std::string& kill : KillFiles(run)) {
        const int fd = open(kill.c_str(), O_WRONLY | O_CREAT, 0644);
        if (fd < 0) {
            std::fprintf(stderr, "\nbwview: cannot create %s: %s\n", kill.c_str(),
                         std::strerror(errno));
            all = false;
            continue;
        }
        close(fd);
        made += (made.empty() ? "" : ", ") + kill;
    }
    if (!made.empty()) screen.Say("Cancel requested: created " + made);
    return all;
}

// Reads the options and the model file; gives an exit code when the viewer
// ends here, else -1.
int ReadCommandLine(int argc, char** argv, std::string& model, double& interval) {
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        if (arg == "--help" || arg == "-h") {
            Help();
            return kExitSuccessful;
        }
        if (arg == "--interval" || arg.rfind("--interval=", 0) == 0) {
            std::string value;
            if (arg.size() > 10) {
                value = arg.substr(11);
            } else if (i + 1 < argc) {
                value = argv[++i];
            } else {
                return UsageError("--interval needs a number of seconds");
            }
            char* end = nullptr;
            interval = std::strtod(value.c_str(), &end);
            if (value.empty() || *end != '\0' || !(interval > 0.0) || interval > 3600.0)
                return UsageError(
                    "--interval needs a number of seconds above 0 and up to 3600, not '" + value +
                    "'");
        } else if (arg.size() > 1 && arg[0] == '-') {
            return UsageError("unknown option " + arg);
        } else if (!model.empty()) {
            return UsageError("one model file only, not both " + model + " and " + arg);
        } else {
            model = arg;
        }
    }
    if (model.empty()) return UsageError("no model file given");
    if (!MarkOf(model).exists) return UsageError(model + ": no such file");
    return -1;
}

enum class Question { None, Cancel, Leave };

}  // namespace

int main(int argc, char** argv) {
    std::string model;
    double interval = 0.5;
    if (const int code = ReadCommandLine(argc, argv, model, interval); code >= 0) return code;
    const int intervalMs = interval * 1000 < 1 ? 1 : static_cast<int>(interval * 1000);

    Screen screen;
    screen.live = isatty(STDOUT_FILENO);
    Input input;
    input.terminal = isatty(STDIN_FILENO);
    if (input.terminal && !screen.live && isatty(STDERR_FILENO)) screen.prompts = stderr;
    StartTerminal(screen.live);

    RunFiles run = LocateRun(model);
    MarkLeftovers(run);
    ViewState state;
    const std::string waiting = "Waiting for the run of " + model + " ...";
    Question question = Question::None;
    bool cancelRequested = false;
    for (;;) {
        const double now = WallNow();
        if (!run.seen) {
            // A run under a launcher names its files once it starts.
            RunFiles found = LocateRun(model);
            if (found.messageFile != run.messageFile) run = found;
        }
        PollMessageFile(run, state, now);
        const RunEnd end = CheckRunEnd(run);
        const bool started = state.records > 0;
        if (end != RunEnd::Running) {
            if (question != Question::None) screen.Answered("(the run ended)");
            if (started) Draw(screen, state, waiting, now);
            if (screen.live) std::printf("\n");
            std::printf("Run ended: %s\n", end == RunEnd::Successful ? "Successful completion"
                                                                     : "Abnormal completion");
            std::fflush(stdout);
            return end == RunEnd::Successful ? kExitSuccessful : kExitAbnormal;
        }
        if (question == Question::None) Draw(screen, state, waiting, now);

        const bool read = started || input.terminal || question != Question::None;
        const InputEvent event = WaitForInput(input, intervalMs, read);
        if (question == Question::None) {
            const bool ask =
                event.kind == InputKind::Interrupt ||
                (event.kind == InputKind::Text && (event.text == "q" || event.text == "Q"));
            if (!ask) continue;
            if (!started) {
                screen.Say("Left the viewer before the run of " + model + " started.");
                return kExitLeft;
            }
            question = cancelRequested ? Question::Leave : Question::Cancel;
            screen.Ask(cancelRequested ? "The cancel is requested; leave the viewer? [y/N] "
                                       : "Cancel the run of " + model + "? [y/N] ");
            continue;
        }
        if (event.kind == InputKind::None) continue;
        if (event.kind == InputKind::Interrupt) {
            screen.Answered("(interrupted)");
            screen.Say("Left the viewer; the run of " + model + " goes on.");
            return kExitLeft;
        }
        const bool yes = event.kind == InputKind::Text && !event.text.empty() &&
                         (event.text[0] == 'y' || event.text[0] == 'Y');
        screen.Answered(event.kind == InputKind::Closed ? "(no answer)" : yes ? "y" : "n");
        if (question == Question::Leave && yes) {
            screen.Say("Left the viewer; the run of " + model + " goes on.");
            return kExitLeft;
        }
        if (question == Question::Cancel && yes)
            cancelRequested = CreateKillFiles(run, screen);
        else if (!screen.live)
            screen.Say("The run goes on.");
        question = Question::None;
    }
}
