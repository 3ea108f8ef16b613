// The viewer's side of the terminal: single keys without echo while a
// terminal is its input, whole lines otherwise; the terminal's settings put
// back on every way out, signals included; the width of the output.
#pragma once

#include <string>

// Makes a terminal on standard input deliver keys one by one without echo,
// and installs the signal handlers: Ctrl-C is reported as an input event,
// termination and hang-up restore the terminal and end the viewer, a stop
// (Ctrl-Z) restores the terminal until the viewer is continued. With
// liveOutput an ending signal leaves the live line with a line end.
void StartTerminal(bool liveOutput);
void RestoreTerminal();
// Columns of the terminal on standard output, 80 when it tells none.
int TerminalWidth();

enum class InputKind { None, Text, Interrupt, Closed };
struct InputEvent {
    InputKind kind = InputKind::None;
    std::string text;  // a key on a terminal, else a line without its end
};

struct Input {
    bool terminal = false;  // keys from a terminal, else lines
    bool closed = false;    // the end of the input was reached
    std::string pending;    // bytes read but not handed out
};

// Waits up to timeoutMs for a key or a line, or for Ctrl-C. With read false
// the input is left for later and only Ctrl-C ends the wait early. Closed
// comes, after the wait, for as long as the input has ended and nothing of it
// is left to hand out.
InputEvent WaitForInput(Input& input, int timeoutMs, bool read);
