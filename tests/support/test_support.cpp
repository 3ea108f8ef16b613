#include "support/test_support.hpp"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <random>

namespace fs = std::filesystem;

namespace bwtest {

TempDir::TempDir() {
    std::random_device rd;
    do path = fs::temp_directory_path() / ("bwtest_" + std::to_string(rd()));
    while (!fs::create_directory(path));
}

TempDir::~TempDir() {
    std::error_code ignored;
    if (std::getenv("BW_KEEP_TEMP") == nullptr) fs::remove_all(path, ignored);
}

std::string ReadFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

void WriteFile(const std::string& path, const std::string& text) {
    std::ofstream out(path, std::ios::binary);
    out << text;
}

std::vector<std::string> ReadLines(const std::string& path) {
    std::vector<std::string> lines;
    std::ifstream in(path);
    std::string line;
    while (std::getline(in, line)) lines.push_back(line);
    return lines;
}

namespace {

// A scratch file whose name is gone at once, for what a child reads or writes.
int ScratchFile() {
    char name[] = "/tmp/bwtest_XXXXXX";
    const int fd = mkstemp(name);
    unlink(name);
    return fd;
}

std::string Slurp(int fd) {
    std::string text;
    char buf[4096];
    ssize_t n;
    lseek(fd, 0, SEEK_SET);
    while ((n = read(fd, buf, sizeof buf)) > 0) text.append(buf, static_cast<size_t>(n));
    close(fd);
    return text;
}

RunResult Run(const std::vector<std::string>& argv, const std::string& cwd,
              const std::map<std::string, std::string>& env, const std::vector<std::string>& unset,
              const std::string* input) {
    // Output goes to files rather than pipes, so that a chatty child never blocks.
    const int inFd = input != nullptr ? ScratchFile() : open("/dev/null", O_RDONLY);
    const int outFd = ScratchFile(), errFd = ScratchFile();
    if (input != nullptr && write(inFd, input->data(), input->size()) >= 0)
        lseek(inFd, 0, SEEK_SET);
    const pid_t pid = fork();
    if (pid == 0) {
        if (!cwd.empty() && chdir(cwd.c_str()) != 0) _exit(127);
        dup2(inFd, 0);
        dup2(outFd, 1);
        dup2(errFd, 2);
        for (const auto& name : unset) unsetenv(name.c_str());
        for (const auto& [name, value] : env) setenv(name.c_str(), value.c_str(), 1);
        std::vector<char*> args;
        for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
        args.push_back(nullptr);
        execv(args[0], args.data());
        _exit(127);
    }
    close(inFd);
    int status = 0;
    waitpid(pid, &status, 0);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status), Slurp(outFd),
            Slurp(errFd)};
}

}  // namespace

RunResult RunProgram(const std::vector<std::string>& argv, const std::string& cwd,
                     const std::map<std::string, std::string>& env,
                     const std::vector<std::string>& unset) {
    return Run(argv, cwd, env, unset, nullptr);
}

RunResult RunProgramWithInput(const std::vector<std::string>& argv, const std::string& cwd,
                              const std::string& input,
                              const std::map<std::string, std::string>& env) {
    return Run(argv, cwd, env, {}, &input);
}

std::string BuiltProgram(const std::string& name) {
    const char* dir = std::getenv("BW_BINARY_DIR");
    std::string base = dir ? dir : BW_BINARY_DIR_FALLBACK;
    for (const char* sub : {"/src/", "/tools/"}) {
        fs::path p = fs::path(base + sub) / name;
        if (fs::is_regular_file(p)) return p.string();
        p = fs::path(base + sub) / name / name;
        if (fs::is_regular_file(p)) return p.string();
    }
    return base + "/src/" + name;
}

}  // namespace bwtest
