// Following a run: the names of its files, the records of its message file
// read as they are appended, and the end of the run read from its log.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

// What the viewer knows of the run, from the records read so far.
struct ViewState {
    std::string statusLabel;   // STALBL
    std::string status;        // STATUS: simulation date and time
    std::string messageLabel;  // MESLBL
    std::string message;       // MESSAG: "Time step: N"
    long long speed = -1;      // COMSPD: points per CPU second
    long long timeLeft = -1;   // TIMLFT, when a writer gives it
    int progress = -1;         // PROGRE: per mille
    int records = 0;           // records read since the file was (re)created
};

// The files of one run.
struct RunFiles {
    std::string model;        // the model file as given
    std::string stem;         // the stem of the channel files
    std::string messageFile;  // stem + "._spi_" (of process 0 under a launcher)
    std::string logFile;
    // Reading position in the message file.
    off_t offset = 0;
    ino_t inode = 0;
    std::string partial;  // a last line not yet ended
};

// The files of the run of a model file. Under a launcher with more processes
// the files of process 0 are followed.
RunFiles LocateRun(const std::string& model);
// The kill files to create: one for each process whose message file exists.
std::vector<std::string> KillFiles(const RunFiles& run);

// Applies one record line ("TAG value") to the state; false if it is none.
bool ApplyRecord(const std::string& line, ViewState& state);
// Reads what was appended since the last call. A file that was re-created or
// cut short starts the state afresh. Returns true when something was read.
bool PollMessageFile(RunFiles& run, ViewState& state);

enum class RunEnd { Running, Successful, Abnormal };
// The end of the run as the last non-empty line of its log tells it.
RunEnd ReadRunEnd(const std::string& logFile);
