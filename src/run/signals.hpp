// Signal handlers: a signal ends the run like StopRun, with a text that says
// which signal came. Floating-point signals carry a sub-code; underflow is
// ignored and the run goes on.
#pragma once

#include <string>

// Binds SIGABRT, SIGILL, SIGINT, SIGSEGV, SIGTERM and SIGFPE. Called first
// thing in the main program.
void InstallSignalHandlers();

// Floating-point sub-codes of the stop message.
constexpr int kFpeInvalid = 129;
constexpr int kFpeDenormal = 130;
constexpr int kFpeZeroDivide = 131;
constexpr int kFpeOverflow = 132;
constexpr int kFpeUnderflow = 133;
constexpr int kFpeInexact = 134;
constexpr int kFpeNonIeee = 0;

// The sub-code of a SIGFPE with the platform's si_code.
int FpeSubCode(int siCode);
// The stop text of a sub-code; empty for underflow, which is ignored.
std::string FpeText(int subCode);
