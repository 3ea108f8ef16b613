// Progress and cancel channel: two files beside the run through which a
// viewer follows it and stops it. The engine appends records to the message
// file (stem + "._spi_"); the viewer creates the kill file (stem + "._kill_"),
// whose mere existence cancels the run at the next check.
//
// A record is a line: a tag of six characters, one blank, the value.
// TARN_PROGRESS=NONE writes nothing; TARN_PROGRESS=STDOUT writes only the
// MESSAG values to standard output.
#pragma once

#include <string>
#include <string_view>

#include "run/datetime.hpp"

struct ProgressState {
    int progressUnit = -1;    // -1 no channel; 0 standard output; above 0 the message file
    std::string channelBase;  // stem of both files, empty when none
    bool cancelSeen = false;  // once true, the kill file is not looked at again
    // Set by the model setup before the time loop starts.
    DateTime simulationStart;  // date and time of step 0
    double timeStep = 0.0;     // seconds a step
    int updateInterval = 0;    // CPU seconds between reports; 0 reports every step
    // Set by StartProgress.
    int firstStep = 0;
    int lastStep = 0;
    float factor = 0.0f;      // 1000 / (last - first)
    double lastReport = 0.0;  // CPU seconds of the loop's clock at the last report
    double clockStart = 0.0;  // CPU seconds of the process when the loop started
};
extern ProgressState gProgress;

// Opens the channel for the parameter file's path less its extension.
void OpenProgressChannel(std::string_view name);
bool IsCancelled();
void StartProgress(int firstStep, int lastStep, int& exitCode);
// After each step: a report when the update interval has passed, then the cancel check.
void ReportProgress(int step, long long pointsPerStep, int& exitCode);
// The bare cancel test: writes the cancel to the log and sets exitCode to -1.
void CheckCancel(int& exitCode);

// Record writers.
void ProgressStatus(std::string_view text);
void ProgressStatusLabel(std::string_view text);
void ProgressMessage(std::string_view text);
void ProgressMessageLabel(std::string_view text);
void ProgressSpeed(long long pointsPerSecond);
void ProgressTimeLeft(long long seconds);
void ProgressValue(int perMille);

// The file names of the channel.
std::string MessageFileName();
std::string KillFileName();
