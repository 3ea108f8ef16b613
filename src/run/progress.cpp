#include "run/progress.hpp"

#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "run/messages.hpp"
#include "run/process.hpp"
#include "run/timing.hpp"
#include "run/units.hpp"

ProgressState gProgress;

namespace {

void WriteRecord(const char* tag, std::string_view value) {
    value = TrimRight(value);
    if (gProgress.progressUnit == 0) {
        if (std::strcmp(tag, "MESSAG") == 0) {
            std::fwrite(value.data(), 1, value.size(), stdout);
            std::fputc('\n', stdout);
            std::fflush(stdout);
        }
        return;
    }
    FILE* file = UnitFile(gProgress.progressUnit);
    if (file == nullptr) return;
    std::fprintf(file, "%s %.*s\n", tag, static_cast<int>(value.size()), value.data());
    std::fflush(file);
}

void WriteIntegerRecord(const char* tag, long long value) {
    char text[33];
    std::snprintf(text, sizeof text, "%10lld", value);
    WriteRecord(tag, text);
}

// Blanks the name from the last occurrence of part to its end, where that
// stands in the file's own name and not in a folder of its path.
void CutAtLast(std::string& name, const char* part) {
    const size_t pos = name.rfind(part);
    const size_t slash = name.find_last_of('/');
    if (pos != std::string::npos && (slash == std::string::npos || pos > slash)) name.erase(pos);
}

}  // namespace

std::string MessageFileName() {
    return gProgress.channelBase + "._spi_";
}
std::string KillFileName() {
    return gProgress.channelBase + "._kill_";
}

void ProgressStatus(std::string_view text) {
    WriteRecord("STATUS", text);
}
void ProgressStatusLabel(std::string_view text) {
    WriteRecord("STALBL", text);
}
void ProgressMessage(std::string_view text) {
    WriteRecord("MESSAG", text);
}
void ProgressMessageLabel(std::string_view text) {
    WriteRecord("MESLBL", text);
}
void ProgressSpeed(long long pointsPerSecond) {
    WriteIntegerRecord("COMSPD", pointsPerSecond);
}
void ProgressTimeLeft(long long seconds) {
    WriteIntegerRecord("TIMLFT", seconds);
}
void ProgressValue(int perMille) {
    WriteIntegerRecord("PROGRE", perMille);
}

void OpenProgressChannel(std::string_view name) {
    gProgress.cancelSeen = false;
    const char* mode = std::getenv("TARN_PROGRESS");
    if (mode != nullptr && std::strcmp(mode, "NONE") == 0) {
        gProgress.progressUnit = -1;
        return;
    }
    if (mode != nullptr && std::strcmp(mode, "STDOUT") == 0) {
        gProgress.progressUnit = 0;
        return;
    }
    std::string base(Trim(name));
    CutAtLast(base, ".log");
    CutAtLast(base, ".inp");
    gProgress.channelBase = ProcessFileStem(base);

    const int unit = GetFreeUnit();
    if (unit < 0) {
        gProgress.channelBase.clear();
        gProgress.progressUnit = -1;
        return;
    }
    if (!OpenUnit(unit, MessageFileName(), "w")) {
        ReleaseUnit(unit);
        StopRun("Unable to open Hud2 message file: " + MessageFileName());
    }
    gProgress.progressUnit = unit;
    std::remove(KillFileName().c_str());  // a stale kill file must not cancel this run
}

bool IsCancelled() {
    if (!gProgress.cancelSeen) {
        struct stat info;
        gProgress.cancelSeen = stat(KillFileName().c_str(), &info) == 0;
    }
    return gProgress.cancelSeen;
}

void StartProgress(int firstStep, int lastStep, int& exitCode) {
    ProgressStatusLabel("Simulation date and time [YYYY-MM-DD hh:mm:ss]");
    ProgressMessageLabel("Simulation time step");
    ProgressStatus(DateTimeText(gProgress.simulationStart));
    ProgressValue(0);
    gProgress.firstStep = firstStep;
    gProgress.lastStep = lastStep;
    gProgress.factor =
        lastStep > firstStep ? 1000.0f / static_cast<float>(lastStep - firstStep) : 1000.0f;
    gProgress.lastReport = 0.0;
    gProgress.clockStart = CpuSeconds();
    CheckCancel(exitCode);
}

void ReportProgress(int step, long long pointsPerStep, int& exitCode) {
    const double t = CpuSeconds() - gProgress.clockStart;
    if (t - gProgress.lastReport >= gProgress.updateInterval) {
        const int done = step - gProgress.firstStep;
        ProgressStatus(
            DateTimeText(AddSeconds(gProgress.simulationStart, done * gProgress.timeStep)));
        ProgressMessage(Filled("Time step: %", step));
        ProgressSpeed(
            t > 0.0 ? static_cast<long long>(done / t * static_cast<double>(pointsPerStep)) : 0);
        const float value = static_cast<float>(done) * gProgress.factor;
        ProgressValue(value >= 1000.0f ? 1000 : static_cast<int>(value));
        gProgress.lastReport = t;
    }
    CheckCancel(exitCode);
}

void CheckCancel(int& exitCode) {
    if (!IsCancelled()) return;
    if (exitCode >= 0) WriteLine("Run is cancelled by the user ...");
    exitCode = kExitAbnormal;
}
