#include "support/test_support.hpp"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <random>
#include <sstream>

namespace fs = std::filesystem;

namespace bwtest {

TempDir::TempDir() {
    std::random_device rd;
    for (;;) {
        path = fs::temp_directory_path() / ("bwtest_" + std::to_string(rd()));
        if (fs::create_directory(path)) break;
    }
}

TempDir::~TempDir() {
    if (std::getenv("BW_KEEP_TEMP") == nullptr) {
        std::error_code ec;
        fs::remove_all(path, ec);
    }
}

std::string ReadFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::stringstream ss;
    ss << in.rdbuf();
    return ss.str();
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

std::string Slurp(int fd) {
    std::string text;
    char buf[4096];
    ssize_t n;
    while ((n = read(fd, buf, sizeof buf)) > 0) text.append(buf, static_cast<size_t>(n));
    return text;
}

RunResult Run(const std::vector<std::string>& argv, const std::string& cwd,
              const std::map<std::string, std::string>& env, const std::vector<std::string>& unset,
              const std::string* input) {
    RunResult result;
    // Output goes to files rather than pipes, so that a chatty child never blocks.
    char outName[] = "/tmp/bwtest_outXXXXXX";
    char errName[] = "/tmp/bwtest_errXXXXXX";
    int outFd = mkstemp(outName);
    int errFd = mkstemp(errName);
    pid_t pid = fork();
    if (pid == 0) {
        if (!cwd.empty() && chdir(cwd.c_str()) != 0) _exit(127);
        dup2(outFd, 1);
        dup2(errFd, 2);
        int inFd = open("/dev/null", O_RDONLY);
        if (input != nullptr) {
            char inName[] = "/tmp/bwtest_inXXXXXX";
            inFd = mkstemp(inName);
            if (write(inFd, input->data(), input->size()) < 0) _exit(127);
            lseek(inFd, 0, SEEK_SET);
            unlink(inName);
        }
        dup2(inFd, 0);
        for (const auto& name : unset) unsetenv(name.c_str());
        for (const auto& [name, value] : env) setenv(name.c_str(), value.c_str(), 1);
        std::vector<char*> args;
        for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
        args.push_back(nullptr);
        execv(args[0], args.data());
        _exit(127);
    }
    int status = 0;
    waitpid(pid, &status, 0);
    if (WIFEXITED(status))
        result.exitCode = WEXITSTATUS(status);
    else if (WIFSIGNALED(status))
        result.exitCode = 128 + WTERMSIG(status);
    lseek(outFd, 0, SEEK_SET);
    lseek(errFd, 0, SEEK_SET);
    result.out = Slurp(outFd);
    result.err = Slurp(errFd);
    close(outFd);
    close(errFd);
    unlink(outName);
    unlink(errName);
    return result;
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
