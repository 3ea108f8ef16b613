// bwview MODEL.bw: follows a run of bw and cancels it on request.
//
// On a terminal it keeps one live line (progress bar, percent, simulation
// date and time, time step, speed, time left) and reads single keys: q or
// Ctrl-C asks whether to cancel. When its output is no terminal it writes a
// plain line whenever the progress changes; when its input is no terminal it
// reads whole lines ("q", then "y" or "n"). It ends when the run's log ends,
// with exit code 0 for a successful run and 1 otherwise.
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <termios.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>

#include "bwview/follow.hpp"
#include "bwview/render.hpp"

namespace {

volatile sig_atomic_t gInterrupted = 0;
termios gSavedTerminal;
bool gRawInput = false;

void RestoreTerminal() {
    if (gRawInput) tcsetattr(STDIN_FILENO, TCSANOW, &gSavedTerminal);
    gRawInput = false;
}

void OnInterrupt(int) {
    gInterrupted = 1;
}

void OnTerminate(int signal) {
    RestoreTerminal();
    std::signal(signal, SIG_DFL);
    std::raise(signal);
}

void MakeInputRaw() {
    if (tcgetattr(STDIN_FILENO, &gSavedTerminal) != 0) return;
    termios raw = gSavedTerminal;
    raw.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
    raw.c_cc[VMIN] = 0;
    raw.c_cc[VTIME] = 0;
    if (tcsetattr(STDIN_FILENO, TCSANOW, &raw) == 0) {
        gRawInput = true;
        std::atexit(RestoreTerminal);
    }
}

double WallNow() {
    timespec ts{};
    clock_gettime(CLOCK_MONOTONIC, &ts);
    return static_cast<double>(ts.tv_sec) + 1e-9 * static_cast<double>(ts.tv_nsec);
}

int TerminalWidth() {
    winsize size{};
    if (ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0) return size.ws_col;
    return 80;
}

// Input: a key on a terminal, a line otherwise. Empty when nothing came
// within the timeout; "\x04" at the end of the input.
struct Input {
    bool terminal = false;
    bool closed = false;
    std::string pending;

    std::string Next(int timeoutMs) {
        if (const size_t nl = pending.find('\n'); nl != std::string::npos) {
            std::string line = pending.substr(0, nl);
            pending.erase(0, nl + 1);
            return line.empty() ? " " : line;
        }
        if (closed) {
            if (timeoutMs > 0) poll(nullptr, 0, timeoutMs);
            return "";
        }
        pollfd fd{STDIN_FILENO, POLLIN, 0};
        if (poll(&fd, 1, timeoutMs) <= 0) return "";
        char buf[256];
        const ssize_t n = read(STDIN_FILENO, buf, sizeof buf);
        if (n <= 0) {
            if (!terminal) closed = true;
            return terminal ? "" : "\x04";
        }
        if (terminal) return std::string(1, buf[0]);
        pending.append(buf, static_cast<size_t>(n));
        return pending.find('\n') == std::string::npos ? "" : Next(0);
    }

    // Waits for an answer to a question: true for yes.
    bool Yes() {
        for (;;) {
            const std::string answer = Next(200);
            if (answer.empty()) {
                if (gInterrupted) return false;
                continue;
            }
            return answer[0] == 'y' || answer[0] == 'Y';
        }
    }
};

void Usage(FILE* out) {
    std::fprintf(
        out,
        "Usage: bwview [--interval SECONDS] MODEL.bw\n"
        "Follows the run of MODEL.bw through its progress file and cancels it on request.\n"
        "Keys: q or Ctrl-C asks whether to cancel the run.\n");
}

}  // namespace

int main(int argc, char** argv) {
    double interval = 0.5;
    std::string model;
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        if (arg == "--help" || arg == "-h") {
            Usage(stdout);
            return 0;
        }
        if (arg == "--interval" && i + 1 < argc) {
            interval = std::atof(argv[++i]);
            if (interval <= 0.0) interval = 0.5;
        } else if (!arg.empty() && arg[0] == '-') {
            std::fprintf(stderr, "bwview: unknown option %s\n", arg.c_str());
            Usage(stderr);
            return 2;
        } else {
            model = arg;
        }
    }
    if (model.empty()) {
        std::fprintf(stderr, "bwview: no model file given\n");
        Usage(stderr);
        return 2;
    }

    const bool terminalOut = isatty(STDOUT_FILENO);
    Input input;
    input.terminal = isatty(STDIN_FILENO);
    if (input.terminal) MakeInputRaw();
    std::signal(SIGINT, OnInterrupt);
    std::signal(SIGTERM, OnTerminate);
    std::signal(SIGHUP, OnTerminate);

    RunFiles run = LocateRun(model);
    // A log that already ends belongs to an earlier run: wait for it to change.
    struct stat logInfo {};
    const bool staleLog =
        ReadRunEnd(run.logFile) != RunEnd::Running && stat(run.logFile.c_str(), &logInfo) == 0;
    const timespec staleTime = logInfo.st_mtim;

    ViewState state;
    RateTracker tracker;
    std::string lastPlain;
    bool announced = false;
    for (;;) {
        if (run.inode == 0) run = LocateRun(model);  // a run under a launcher may appear later
        PollMessageFile(run, state);

        RunEnd end = ReadRunEnd(run.logFile);
        if (end != RunEnd::Running && staleLog) {
            struct stat now {};
            stat(run.logFile.c_str(), &now);
            if (now.st_mtim.tv_sec == staleTime.tv_sec && now.st_mtim.tv_nsec == staleTime.tv_nsec)
                end = RunEnd::Running;
        }

        const double left = EstimateTimeLeft(state, WallNow(), tracker);
        if (state.records == 0 && end == RunEnd::Running) {
            if (!announced) {
                std::printf("Waiting for the run of %s ...\n", model.c_str());
                std::fflush(stdout);
                announced = true;
            }
        } else if (terminalOut) {
            std::printf("\r\033[K%s", RenderLine(state, left, TerminalWidth() - 1, true).c_str());
            std::fflush(stdout);
        } else {
            const std::string line = RenderLine(state, -1.0, 0, false);
            if (line != lastPlain) {
                std::printf("%s\n", line.c_str());
                std::fflush(stdout);
                lastPlain = line;
            }
        }

        if (end != RunEnd::Running) {
            if (terminalOut) std::printf("\n");
            std::printf("Run ended: %s\n", end == RunEnd::Successful ? "Successful completion"
                                                                     : "Abnormal completion");
            return end == RunEnd::Successful ? 0 : 1;
        }

        const std::string key = input.Next(static_cast<int>(interval * 1000));
        const bool ask = gInterrupted || key == "q" || key == "Q" || key == "\x03";
        if (!ask) continue;
        gInterrupted = 0;
        std::printf("%sCancel the run of %s? [y/N] ", terminalOut ? "\n" : "", model.c_str());
        std::fflush(stdout);
        if (input.Yes()) {
            for (const std::string& kill : KillFiles(run)) {
                if (FILE* f = std::fopen(kill.c_str(), "w")) std::fclose(f);
                std::printf("\nCancel requested: %s", kill.c_str());
            }
            std::printf("\n");
        } else {
            std::printf("\nThe run goes on.\n");
        }
        std::fflush(stdout);
        gInterrupted = 0;
    }
}
