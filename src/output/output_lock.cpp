#include "output/output_lock.hpp"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <vector>

#include "run/messages.hpp"

namespace {

struct HeldLock {
    std::string file;  // the output's absolute path, to find a second writer in this run
    std::string lockPath;
    int fd = -1;
};

std::vector<HeldLock> gHeldLocks;

std::string AbsolutePath(const std::string& path) {
    std::error_code error;
    const std::filesystem::path full = std::filesystem::weakly_canonical(path, error);
    return error ? path : full.string();
}

std::string HostName() {
    char host[256] = {};
    if (gethostname(host, sizeof host - 1) != 0) return "this machine";
    return host;
}

// The writer named in a lock file: "process <pid> on <host>".
std::string Holder(int fd) {
    char text[300] = {};
    const ssize_t n = pread(fd, text, sizeof text - 1, 0);
    std::string holder = n > 0 ? std::string(text, static_cast<size_t>(n)) : std::string();
    while (!holder.empty() && (holder.back() == '\n' || holder.back() == ' ')) holder.pop_back();
    return holder.empty() ? "another process" : holder;
}

// True when fd is still the file at path: a run that ends removes its lock
// file, and one opened just before that is no lock any more.
bool StillThere(int fd, const std::string& path) {
    struct stat open {
    }, named{};
    return fstat(fd, &open) == 0 && stat(path.c_str(), &named) == 0 &&
           open.st_dev == named.st_dev && open.st_ino == named.st_ino;
}

}  // namespace

void LockOutputFile(std::string_view routine, const std::string& path) {
    const std::string file = AbsolutePath(path);
    for (const HeldLock& held : gHeldLocks)
        if (held.file == file)
            StopRun(std::string(routine) + ": " + path +
                    " is written by two outputs of this model; each output needs a file of "
                    "its own");
    const std::string lockPath = path + ".lock";
    for (int attempt = 0; attempt < 8; ++attempt) {
        const int fd = open(lockPath.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644);
        // The file itself can't be made there either: its creation will tell why.
        if (fd < 0) return;
        if (flock(fd, LOCK_EX | LOCK_NB) != 0) {
            const int error = errno;
            if (error != EWOULDBLOCK) {
                close(fd);  // a file system without locks: the run goes on unguarded
                return;
            }
            const std::string holder = Holder(fd);
            close(fd);
            StopRun(std::string(routine) + ": " + path + " is being written by another run (" +
                    holder + "); two runs must not write one file: give this model's outputs " +
                    "other names, or wait for that run to end");
        }
        if (!StillThere(fd, lockPath)) {
            close(fd);
            continue;
        }
        const std::string holder =
            "process " + std::to_string(getpid()) + " on " + HostName() + "\n";
        // The text is for the message of a refused run; the lock holds without it.
        if (ftruncate(fd, 0) == 0) {
            const ssize_t written = pwrite(fd, holder.data(), holder.size(), 0);
            static_cast<void>(written);
        }
        if (gHeldLocks.empty()) AddExitCleanup(ReleaseOutputLocks);
        gHeldLocks.push_back({file, lockPath, fd});
        return;
    }
}

void UnlockOutputFile(const std::string& path) {
    const std::string file = AbsolutePath(path);
    for (auto held = gHeldLocks.begin(); held != gHeldLocks.end(); ++held) {
        if (held->file != file) continue;
        unlink(held->lockPath.c_str());
        close(held->fd);
        gHeldLocks.erase(held);
        return;
    }
}

void ReleaseOutputLocks() {
    // Removed while still locked, so that no other run takes the old file.
    for (const HeldLock& held : gHeldLocks) {
        unlink(held.lockPath.c_str());
        close(held.fd);
    }
    gHeldLocks.clear();
}
