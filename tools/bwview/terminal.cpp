#include "bwview/terminal.hpp"

#include <poll.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>

namespace {

volatile sig_atomic_t gInterrupts = 0;
volatile sig_atomic_t gRaw = 0;
volatile sig_atomic_t gLiveOutput = 0;
termios gSaved;
termios gRawSettings;

void Install(int signal, void (*handler)(int)) {
    struct sigaction action {};
    action.sa_handler = handler;
    sigemptyset(&action.sa_mask);
    action.sa_flags = 0;  // no restart: a signal ends the wait at once
    sigaction(signal, &action, nullptr);
}

void OnInterrupt(int) {
    gInterrupts = gInterrupts + 1;
}

// Wakes the wait, so that the line is drawn at once in the new width.
void OnResize(int) {}

void OnTerminate(int signal) {
    if (gRaw) tcsetattr(STDIN_FILENO, TCSANOW, &gSaved);
    // The shell's next words go below the live line, not behind it.
    if (gLiveOutput && write(STDOUT_FILENO, "\n", 1) < 0) gLiveOutput = 0;
    struct sigaction action {};
    action.sa_handler = SIG_DFL;
    sigemptyset(&action.sa_mask);
    sigaction(signal, &action, nullptr);
    sigset_t set;
    sigemptyset(&set);
    sigaddset(&set, signal);
    sigprocmask(SIG_UNBLOCK, &set, nullptr);
    raise(signal);
}

// Ctrl-Z: the shell gets its terminal back as it was; on continuing the keys
// are taken one by one again.
void OnStop(int signal) {
    const int saved = errno;
    if (gRaw) tcsetattr(STDIN_FILENO, TCSANOW, &gSaved);
    Install(signal, SIG_DFL);
    sigset_t set;
    sigemptyset(&set);
    sigaddset(&set, signal);
    sigprocmask(SIG_UNBLOCK, &set, nullptr);
    raise(signal);
    // Continued.
    Install(signal, OnStop);
    if (gRaw) tcsetattr(STDIN_FILENO, TCSANOW, &gRawSettings);
    errno = saved;
}

InputEvent TakeLine(Input& input) {
    const size_t nl = input.pending.find('\n');
    if (nl == std::string::npos) return {};
    std::string line = input.pending.substr(0, nl);
    input.pending.erase(0, nl + 1);
    while (!line.empty() && (line.back() == '\r' || line.back() == ' ')) line.pop_back();
    return {InputKind::Text, line};
}

}  // namespace

void RestoreTerminal() {
    if (gRaw) tcsetattr(STDIN_FILENO, TCSANOW, &gSaved);
    gRaw = 0;
}

void StartTerminal(bool liveOutput) {
    gLiveOutput = liveOutput;
    Install(SIGINT, OnInterrupt);
    Install(SIGWINCH, OnResize);
    for (int signal : {SIGTERM, SIGHUP, SIGQUIT, SIGPIPE}) Install(signal, OnTerminate);
    if (!isatty(STDIN_FILENO) || tcgetattr(STDIN_FILENO, &gSaved) != 0) return;
    gRawSettings = gSaved;
    // Keys without waiting for a line and without echo; Ctrl-C still raises SIGINT.
    gRawSettings.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
    gRawSettings.c_cc[VMIN] = 1;
    gRawSettings.c_cc[VTIME] = 0;
    if (tcsetattr(STDIN_FILENO, TCSANOW, &gRawSettings) != 0) return;
    gRaw = 1;
    std::atexit(RestoreTerminal);
    Install(SIGTSTP, OnStop);
}

int TerminalWidth() {
    winsize size{};
    if (ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0) return size.ws_col;
    return 80;
}

InputEvent WaitForInput(Input& input, int timeoutMs, bool read) {
    if (read && !input.terminal) {
        if (InputEvent line = TakeLine(input); line.kind != InputKind::None) return line;
    }
    if (read && input.terminal && !input.pending.empty()) {
        InputEvent key{InputKind::Text, input.pending.substr(0, 1)};
        input.pending.erase(0, 1);
        return key;
    }
    if (gInterrupts > 0) {
        gInterrupts = 0;
        return {InputKind::Interrupt, ""};
    }
    pollfd fd{STDIN_FILENO, POLLIN, 0};
    const bool watch = read && !input.closed;
    const int ready = poll(watch ? &fd : nullptr, watch ? 1 : 0, timeoutMs);
    if (gInterrupts > 0) {
        gInterrupts = 0;
        return {InputKind::Interrupt, ""};
    }
    if (read && input.closed) return {InputKind::Closed, ""};
    if (ready <= 0 || !watch) return {};
    char buffer[256];
    const ssize_t n = ::read(STDIN_FILENO, buffer, sizeof buffer);
    if (n < 0) return {};
    if (n == 0) {
        input.closed = true;
        // A last line without its end still counts.
        if (!input.terminal && !input.pending.empty()) input.pending += '\n';
        if (InputEvent line = TakeLine(input); line.kind != InputKind::None) return line;
        return {InputKind::Closed, ""};
    }
    input.pending.append(buffer, static_cast<size_t>(n));
    return WaitForInput(input, 0, true);
}
