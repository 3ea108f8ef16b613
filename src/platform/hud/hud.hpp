// The viewer's library, as the engine calls it: a message to the user and the
// end of the process. On this platform a message goes to standard error.
#pragma once

// Style values of a message (the icon a graphical viewer would show).
constexpr int kHudStyleStop = 16;

// Writes "title: text" to standard error.
void hudMessage(const char* text, const char* title, int style);
// Ends the process with the code; -1 reaches the shell as 255. Open C
// streams are flushed first.
[[noreturn]] void hudExit(int code);
