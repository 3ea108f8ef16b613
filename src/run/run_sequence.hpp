// The main program: everything from process start to process exit that no
// subsystem owns. It sets the floating-point mode, starts the process layer,
// reads the command line, opens the parameter file and the log, reads the
// model setup, fixes the thread count, hands over to a solver and shuts down.
#pragma once

#include <string>
#include <string_view>

constexpr const char* kUsage = "Usage: bw [//hud] [options] kvt-file";
constexpr const char* kProgramTitle = "TARNEL BW";

// Walks the arguments (argv[1..]) and gives the parameter file name, empty
// when none is left; an option blanks the name read before it.
// "-check" is an option too: check sets it (where given), and the model is
// read and checked without a time step.
std::string ParseArguments(int argc, const char* const* argv, int& debugLevel,
                           bool* check = nullptr);
// The stem of the progress channel: the path less its file's extension, as the log's.
std::string ChannelName(std::string_view fileName);

// The command line, the channel, the parameter file and the log.
void ReadCommandLine(int argc, const char* const* argv);
// The closing steps: performance block, log closed, processes finished, exit.
[[noreturn]] void Shutdown(const std::string& fileName, int exitCode);
// The whole run sequence; ends the process.
[[noreturn]] void RunMain(int argc, const char* const* argv);
