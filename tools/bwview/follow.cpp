#include "bwview/follow.hpp"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>

namespace {

// Bytes kept from the end of what was read, compared before each further
// read: a file truncated and written past the old length shows other bytes there.
constexpr size_t kTailBytes = 64;
// At most this much is read in one poll; the rest follows at the next.
constexpr off_t kMaxChunk = 8 << 20;

std::string TrimRight(std::string text) {
    while (!text.empty() && (text.back() == ' ' || text.back() == '\r' || text.back() == '\n' ||
                             text.back() == '\t'))
        text.pop_back();
    return text;
}

bool Integer(const std::string& text, long long& value) {
    char* end = nullptr;
    const long long parsed = std::strtoll(text.c_str(), &end, 10);
    if (end == text.c_str()) return false;
    value = parsed;
    return true;
}

bool SameMark(const FileMark& a, const FileMark& b) {
    return a.exists == b.exists && a.inode == b.inode && a.size == b.size &&
           a.modified.tv_sec == b.modified.tv_sec && a.modified.tv_nsec == b.modified.tv_nsec;
}

bool NotNewer(const timespec& a, const timespec& b) {
    return a.tv_sec < b.tv_sec || (a.tv_sec == b.tv_sec && a.tv_nsec <= b.tv_nsec);
}

std::string ReadRange(int fd, off_t from, size_t count) {
    std::string text(count, '\0');
    size_t got = 0;
    while (got < count) {
        const ssize_t n = pread(fd, text.data() + got, count - got, from + static_cast<off_t>(got));
        if (n <= 0) break;
        got += static_cast<size_t>(n);
    }
    text.resize(got);
    return text;
}

void KeepTail(RunFiles& run, const std::string& chunk) {
    run.tail += chunk;
    if (run.tail.size() > kTailBytes) run.tail.erase(0, run.tail.size() - kTailBytes);
}

void StartAfresh(RunFiles& run, ino_t inode, ViewState& state) {
    run.inode = inode;
    run.offset = 0;
    run.tail.clear();
    run.partial.clear();
    state = ViewState{};
}

}  // namespace

FileMark MarkOf(const std::string& path) {
    FileMark mark;
    struct stat info;
    if (stat(path.c_str(), &info) != 0) return mark;
    mark.exists = true;
    mark.inode = info.st_ino;
    mark.size = info.st_size;
    mark.modified = info.st_mtim;
    return mark;
}

std::string ChannelStem(const std::string& model) {
    const size_t lower = model.rfind(".bw");
    const size_t upper = model.rfind(".BW");
    size_t cut = lower;
    if (upper != std::string::npos && (cut == std::string::npos || upper > cut)) cut = upper;
    std::string stem = cut == std::string::npos ? model : model.substr(0, cut);
    for (const char* part : {".log", ".inp"}) {
        const size_t pos = stem.rfind(part);
        if (pos != std::string::npos) stem.erase(pos);
    }
    return stem;
}

std::string LogName(const std::string& model, bool perProcess) {
    std::string name = model;
    const size_t slash = name.find_last_of('/');
    const size_t dot = name.rfind('.');
    if (dot != std::string::npos && (slash == std::string::npos || dot > slash)) name.erase(dot);
    return name + (perProcess ? "_p0" : "") + ".log";
}

RunFiles LocateRun(const std::string& model) {
    RunFiles run;
    run.model = model;
    run.stem = ChannelStem(model);
    run.perProcess = !MarkOf(run.stem + "._spi_").exists && MarkOf(run.stem + "_p0._spi_").exists;
    run.messageFile = run.stem + (run.perProcess ? "_p0" : "") + "._spi_";
    run.logFile = LogName(model, run.perProcess);
    return run;
}

void MarkLeftovers(RunFiles& run) {
    if (ReadRunEnd(run.logFile) == RunEnd::Running) return;
    run.staleLog = true;
    run.staleLogMark = MarkOf(run.logFile);
    const FileMark message = MarkOf(run.messageFile);
    // The engine writes the log's last line after its last record, so the
    // records of the ended run are no newer than its log.
    if (!message.exists || !NotNewer(message.modified, run.staleLogMark.modified)) return;
    run.seen = true;
    run.inode = message.inode;
    run.offset = message.size;
    const int fd = open(run.messageFile.c_str(), O_RDONLY);
    if (fd < 0) return;
    const off_t from = message.size > static_cast<off_t>(kTailBytes)
                           ? message.size - static_cast<off_t>(kTailBytes)
                           : 0;
    run.tail = ReadRange(fd, from, static_cast<size_t>(message.size - from));
    close(fd);
}

std::vector<std::string> KillFiles(const RunFiles& run) {
    if (!run.perProcess) return {run.stem + "._kill_"};
    const size_t slash = run.stem.find_last_of('/');
    const std::string folder = slash == std::string::npos ? "" : run.stem.substr(0, slash + 1);
    const std::string prefix =
        (slash == std::string::npos ? run.stem : run.stem.substr(slash + 1)) + "_p";
    const std::string suffix = "._spi_";
    std::vector<std::pair<long, std::string>> found;
    if (DIR* dir = opendir(folder.empty() ? "." : folder.c_str())) {
        while (const dirent* entry = readdir(dir)) {
            const std::string name = entry->d_name;
            if (name.size() <= prefix.size() + suffix.size() ||
                name.compare(0, prefix.size(), prefix) != 0 ||
                name.compare(name.size() - suffix.size(), suffix.size(), suffix) != 0)
                continue;
            const std::string id =
                name.substr(prefix.size(), name.size() - prefix.size() - suffix.size());
            if (id.find_first_not_of("0123456789") != std::string::npos) continue;
            found.emplace_back(std::atol(id.c_str()), folder + prefix + id + "._kill_");
        }
        closedir(dir);
    }
    std::sort(found.begin(), found.end());
    std::vector<std::string> files;
    for (const auto& [id, path] : found) files.push_back(path);
    if (files.empty()) files.push_back(run.stem + "_p0._kill_");
    return files;
}

bool ApplyRecord(const std::string& line, ViewState& state, double nowWall) {
    if (line.size() < 6 || (line.size() > 6 && line[6] != ' ')) return false;
    const std::string tag = line.substr(0, 6);
    const std::string value = line.size() > 7 ? TrimRight(line.substr(7)) : "";
    long long number = 0;
    if (tag == "STATUS") {
        state.status = value;
    } else if (tag == "STALBL") {
        state.statusLabel = value;
    } else if (tag == "MESSAG") {
        state.message = value;
    } else if (tag == "MESLBL") {
        state.messageLabel = value;
    } else if (tag == "COMSPD") {
        if (!Integer(value, number)) return false;
        state.speed = number;
    } else if (tag == "TIMLFT") {
        if (!Integer(value, number)) return false;
        state.timeLeft = number;
    } else if (tag == "PROGRE") {
        if (!Integer(value, number)) return false;
        const int progress = static_cast<int>(std::clamp(number, 0LL, 1000LL));
        // The rate counts from the first value seen: all that was read in the
        // viewer's first look at the file is one starting point, and a value
        // that goes back starts the count again.
        if (state.firstProgress < 0 || progress < state.progress || nowWall == state.firstWall) {
            state.firstProgress = progress;
            state.firstWall = nowWall;
            state.changeWall = nowWall;
        } else if (progress != state.progress) {
            state.changeWall = nowWall;
        }
        state.progress = progress;
    } else {
        return false;
    }
    ++state.records;
    return true;
}

bool PollMessageFile(RunFiles& run, ViewState& state, double nowWall) {
    const int fd = open(run.messageFile.c_str(), O_RDONLY);
    if (fd < 0) return false;
    struct stat info;
    if (fstat(fd, &info) != 0) {
        close(fd);
        return false;
    }
    bool changed = false;
    if (!run.seen) {
        run.seen = true;
        StartAfresh(run, info.st_ino, state);
    } else if (info.st_ino != run.inode || info.st_size < run.offset) {
        // A new run re-created the file, or cut it.
        StartAfresh(run, info.st_ino, state);
        changed = true;
    } else if (info.st_size > run.offset && !run.tail.empty()) {
        const off_t from = run.offset - static_cast<off_t>(run.tail.size());
        if (ReadRange(fd, from, run.tail.size()) != run.tail) {
            // Cut and written past the old length between two looks.
            StartAfresh(run, info.st_ino, state);
            changed = true;
        }
    }
    if (info.st_size > run.offset) {
        const off_t count = std::min(info.st_size - run.offset, kMaxChunk);
        const std::string chunk = ReadRange(fd, run.offset, static_cast<size_t>(count));
        run.offset += static_cast<off_t>(chunk.size());
        KeepTail(run, chunk);
        run.partial += chunk;
        size_t start = 0;
        for (size_t end; (end = run.partial.find('\n', start)) != std::string::npos;
             start = end + 1)
            changed =
                ApplyRecord(run.partial.substr(start, end - start), state, nowWall) || changed;
        run.partial.erase(0, start);
    }
    close(fd);
    return changed;
}

RunEnd ReadRunEnd(const std::string& logFile) {
    std::ifstream in(logFile, std::ios::binary);
    if (!in) return RunEnd::Running;
    // The end is in the last few hundred bytes.
    in.seekg(0, std::ios::end);
    const std::streamoff size = in.tellg();
    const std::streamoff from = size > 512 ? size - 512 : 0;
    in.seekg(from);
    std::string tail(static_cast<size_t>(size - from), '\0');
    in.read(tail.data(), static_cast<std::streamsize>(tail.size()));
    tail = TrimRight(tail);
    const size_t nl = tail.rfind('\n');
    const std::string last = TrimRight(nl == std::string::npos ? tail : tail.substr(nl + 1));
    if (last == "Successful completion") return RunEnd::Successful;
    if (last == "Abnormal completion") return RunEnd::Abnormal;
    return RunEnd::Running;
}

RunEnd CheckRunEnd(RunFiles& run) {
    if (run.staleLog) {
        if (SameMark(MarkOf(run.logFile), run.staleLogMark)) return RunEnd::Running;
        run.staleLog = false;
    }
    return ReadRunEnd(run.logFile);
}
