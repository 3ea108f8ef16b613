// Helpers shared by the tests: a scratch folder per test, reading and writing
// small files, and running a program with its output and exit code captured.
#pragma once

#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace bwtest {

// A fresh folder below the system's temporary folder, removed when it goes
// out of scope (kept when BW_KEEP_TEMP is set, for a look after a failure).
struct TempDir {
    std::filesystem::path path;
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;
    std::string operator/(const std::string& name) const { return (path / name).string(); }
};

std::string ReadFile(const std::string& path);
void WriteFile(const std::string& path, const std::string& text);
std::vector<std::string> ReadLines(const std::string& path);

struct RunResult {
    int exitCode = -1;  // the shell's view: 0..255, or 128 + signal
    std::string out;    // standard output
    std::string err;    // standard error
};

// Runs argv[0] with the arguments in folder cwd, the variables of env set in
// its environment and those named in unset removed.
RunResult RunProgram(const std::vector<std::string>& argv, const std::string& cwd,
                     const std::map<std::string, std::string>& env = {},
                     const std::vector<std::string>& unset = {});

// The same with the given text on standard input.
RunResult RunProgramWithInput(const std::vector<std::string>& argv, const std::string& cwd,
                              const std::string& input,
                              const std::map<std::string, std::string>& env = {});

// The path of a program built by this project (bw, bwview, bwdata, ...).
std::string BuiltProgram(const std::string& name);

}  // namespace bwtest
