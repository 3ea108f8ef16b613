// Messages, log lines and the ways a run ends.
//
// Every line the engine shows passes through here: the line writer of the log
// (standard output while no log is open), the warning and fatal message forms,
// the filling of '%' in message patterns and the number formatter behind it,
// the block headings of the log's reports, and the two ends of a run:
// NormalExit (closing words and exit code) and StopRun (the orderly stop of a
// run that met bad input; it closes no output file).
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

// Exit codes of the process.
constexpr int kExitNormal = 0;
constexpr int kExitAbnormal = -1;  // cancelled by the user, or blown up
constexpr int kExitFatal = 1;      // StopRun, ReportFatal, signals
constexpr int kExitFloatingPoint = 8;

struct MessageState {
    int logUnit = 0;      // above 0: the log is open; -1 once the shutdown closed it
    int meshLogUnit = 0;  // the mesh solver's copy of the log unit, for its report blocks
};
extern MessageState gMessages;

void SetLogUnit(int unit);

// Trims trailing blanks and writes one line to the log if it is open, else to standard output.
void WriteLine(std::string_view text);
// Writes the trimmed text in lines of 70 characters.
void WriteWrapped(std::string_view text);
// Writes text into the log without ending the line (nothing when no log is open).
void WriteLogPart(std::string_view text);

// "Warning: " message in pieces of 61 characters; the run goes on.
void ReportWarning(std::string_view text);
// A warning the user must see before the run goes on: ReportWarning, and
// "Warning: " with the text on standard output too while a log is open
// (without a log the warning is there already), but not in a night build
// (BUILDMODE "NIGHT").
void ReportUserWarning(std::string_view text);
// "Fatal error: " message in pieces of 57 characters, then NormalExit(1).
[[noreturn]] void ReportFatal(std::string_view text);
// The orderly stop: the text to the log and to the user, then the closing
// words and the end of the process with code (1 when none is given).
[[noreturn]] void StopRun(std::string_view text);
[[noreturn]] void StopRun(std::string_view text, int code);
// Writes "Successful completion" (code 0) or "Abnormal completion" to the log
// and ends the process with the code.
[[noreturn]] void NormalExit(int code = 0);

// Registers a routine to run just before the process ends by any of the ways
// above, signals included (removal of scratch files). It must only release
// resources: it must not write messages or stop.
void AddExitCleanup(void (*cleanup)());
// Runs the registered routines once; called by the exits of this layer.
void RunExitCleanups();

// Fills the first '%' of pattern with the value: out becomes the text before
// the '%', the value trimmed, and the text behind the '%' trimmed. Without a
// '%' in the pattern, out keeps what it held. Numbers are formatted by
// FormatNumber at width 10 and left-adjusted. Pattern and out may be the same
// string, so that "near (%,%)" is filled by two calls.
void FillPercent(std::string& out, std::string_view pattern, std::string_view value);
void FillPercent(std::string& out, std::string_view pattern, int32_t value);
void FillPercent(std::string& out, std::string_view pattern, float value);
void FillPercent(std::string& out, std::string_view pattern, double value);
// Returns pattern with its first '%' filled (pattern itself if it holds none).
std::string Filled(std::string_view pattern, std::string_view value);
std::string Filled(std::string_view pattern, int32_t value);
std::string Filled(std::string_view pattern, float value);
std::string Filled(std::string_view pattern, double value);

// The shortest plain text of value that fits in width columns (1 to 20),
// right-adjusted: fixed form where it fits, exponent form for large and tiny
// values, width asterisks where even that fails.
std::string FormatNumber(double value, int width);
std::string FormatNumber(float value, int width);
std::string FormatNumber(int32_t value, int width);
// FormatNumber at width 10, left-adjusted and trimmed: the form of numbers in messages.
std::string NumberText(double value);

// A block head of the log's reports, 70 columns wide; an empty title gives a closing line.
void WriteBlockHeading(std::string_view title);
// Fills the '%' of the label with the value and writes it behind two blanks.
void WriteLabelled(std::string_view label, std::string_view value);
void WriteLabelled(std::string_view label, int32_t value);
void WriteLabelled(std::string_view label, float value);
void WriteLabelled(std::string_view label, double value);

// Text helpers shared by the writers.
std::string_view TrimRight(std::string_view text);
std::string_view Trim(std::string_view text);
