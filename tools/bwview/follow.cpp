#include "bwview/follow.hpp"

#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>

namespace {

bool Exists(const std::string& path) {
    struct stat info;
    return stat(path.c_str(), &info) == 0;
}

std::string TrimRight(std::string text) {
    while (!text.empty() && (text.back() == ' ' || text.back() == '\r')) text.pop_back();
    return text;
}

long long Integer(const std::string& text, long long fallback) {
    char* end = nullptr;
    const long long value = std::strtoll(text.c_str(), &end, 10);
    return end == text.c_str() ? fallback : value;
}

}  // namespace

RunFiles LocateRun(const std::string& model) {
    RunFiles run;
    run.model = model;
    // The channel's stem: the name less its later ".bw" or ".BW".
    const size_t lower = model.rfind(".bw");
    const size_t upper = model.rfind(".BW");
    size_t cut = lower;
    if (upper != std::string::npos && (cut == std::string::npos || upper > cut)) cut = upper;
    std::string stem = cut == std::string::npos ? model : model.substr(0, cut);
    for (const char* part : {".log", ".inp"}) {
        const size_t pos = stem.rfind(part);
        if (pos != std::string::npos) stem.erase(pos);
    }
    // The log: the extension of the model's name replaced by ".log".
    std::string logStem = model;
    const size_t slash = logStem.find_last_of('/');
    const size_t dot = logStem.rfind('.');
    if (dot != std::string::npos && (slash == std::string::npos || dot > slash)) logStem.erase(dot);

    run.stem = stem;
    run.messageFile = stem + "._spi_";
    run.logFile = logStem + ".log";
    if (!Exists(run.messageFile) && Exists(stem + "_p0._spi_")) {
        run.messageFile = stem + "_p0._spi_";
        run.logFile = logStem + "_p0.log";
    }
    return run;
}

std::vector<std::string> KillFiles(const RunFiles& run) {
    std::vector<std::string> files;
    if (Exists(run.stem + "._spi_") || !Exists(run.stem + "_p0._spi_"))
        files.push_back(run.stem + "._kill_");
    for (int p = 0; Exists(run.stem + "_p" + std::to_string(p) + "._spi_"); ++p)
        files.push_back(run.stem + "_p" + std::to_string(p) + "._kill_");
    return files;
}

bool ApplyRecord(const std::string& line, ViewState& state) {
    if (line.size() < 6 || (line.size() > 6 && line[6] != ' ')) return false;
    const std::string tag = line.substr(0, 6);
    const std::string value = line.size() > 7 ? TrimRight(line.substr(7)) : "";
    if (tag == "STATUS")
        state.status = value;
    else if (tag == "STALBL")
        state.statusLabel = value;
    else if (tag == "MESSAG")
        state.message = value;
    else if (tag == "MESLBL")
        state.messageLabel = value;
    else if (tag == "COMSPD")
        state.speed = Integer(value, state.speed);
    else if (tag == "TIMLFT")
        state.timeLeft = Integer(value, state.timeLeft);
    else if (tag == "PROGRE")
        state.progress = static_cast<int>(Integer(value, state.progress));
    else
        return false;
    ++state.records;
    return true;
}

bool PollMessageFile(RunFiles& run, ViewState& state) {
    struct stat info;
    if (stat(run.messageFile.c_str(), &info) != 0) return false;
    if (info.st_ino != run.inode || info.st_size < run.offset) {
        // A new run re-created the file, or cut it: start afresh.
        run.inode = info.st_ino;
        run.offset = 0;
        run.partial.clear();
        state = ViewState{};
    }
    if (info.st_size == run.offset) return false;
    std::ifstream in(run.messageFile, std::ios::binary);
    in.seekg(run.offset);
    std::string chunk(static_cast<size_t>(info.st_size - run.offset), '\0');
    in.read(chunk.data(), static_cast<std::streamsize>(chunk.size()));
    chunk.resize(static_cast<size_t>(in.gcount()));
    run.offset += static_cast<off_t>(chunk.size());
    run.partial += chunk;
    bool any = false;
    size_t start = 0;
    for (size_t end; (end = run.partial.find('\n', start)) != std::string::npos; start = end + 1)
        any = ApplyRecord(run.partial.substr(start, end - start), state) || any;
    run.partial.erase(0, start);
    return any;
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
    while (!tail.empty() && (tail.back() == '\n' || tail.back() == ' ' || tail.back() == '\r'))
        tail.pop_back();
    const size_t nl = tail.rfind('\n');
    const std::string last = TrimRight(nl == std::string::npos ? tail : tail.substr(nl + 1));
    if (last == "Successful completion") return RunEnd::Successful;
    if (last == "Abnormal completion") return RunEnd::Abnormal;
    return RunEnd::Running;
}
