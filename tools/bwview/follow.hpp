// Following a run: the names of its files, the records of its message file
// read as the engine appends them, and the end of the run read from its log.
//
// The engine re-creates the message file at the start of a run (same name,
// possibly the same inode, truncated) and then appends one flushed line per
// record: a tag of six characters, a blank and the value. The viewer reads
// from where it left off, keeps an unended last line for the next poll, and
// starts afresh when the file was replaced or rewritten under it.
#pragma once

#include <sys/types.h>

#include <ctime>
#include <string>
#include <vector>

// What the viewer knows of the run, from the records read so far.
struct ViewState {
    std::string statusLabel;   // STALBL
    std::string status;        // STATUS: simulation date and time
    std::string messageLabel;  // MESLBL
    std::string message;       // MESSAG: "Time step: N" or another text
    long long speed = -1;      // COMSPD: points per CPU second
    long long timeLeft = -1;   // TIMLFT, when a writer gives it
    int progress = -1;         // PROGRE: per mille
    int records = 0;           // records read since the file was (re)created

    // The rate of progress: the first value seen and when, and when the
    // value last changed (wall seconds of the viewer's clock).
    int firstProgress = -1;
    double firstWall = 0.0;
    double changeWall = 0.0;
};

// Where a file stood when it was last looked at; tells a rewritten file from
// one that only grew.
struct FileMark {
    bool exists = false;
    ino_t inode = 0;
    off_t size = 0;
    timespec modified{};
};

// The files of one run and the reading position in its message file.
struct RunFiles {
    std::string model;        // the model file as given
    std::string stem;         // the stem of the channel files
    bool perProcess = false;  // files of process 0 under a launcher (stem_p0...)
    std::string messageFile;  // stem + "._spi_", or stem + "_p0._spi_"
    std::string logFile;      // the model's name with ".log" for its extension

    bool seen = false;    // the message file has been found at least once
    ino_t inode = 0;      // of the message file being read
    off_t offset = 0;     // bytes consumed so far
    std::string tail;     // the last bytes consumed, to notice a rewrite
    std::string partial;  // a last line not yet ended

    // A log that already told the end of an earlier run when the viewer
    // started; its end counts only once the log has been rewritten.
    bool staleLog = false;
    FileMark staleLogMark;
};

// The channel stem of a model file: the name less its later ".bw" or ".BW",
// then cut at the last ".log" and at the last ".inp".
std::string ChannelStem(const std::string& model);
// The log of a model file: its extension replaced by ".log", with "_p0"
// behind the stem for the files of process 0.
std::string LogName(const std::string& model, bool perProcess);

// The files of the run of a model file. The files of process 0 are followed
// when stem_p0._spi_ exists and stem._spi_ does not.
RunFiles LocateRun(const std::string& model);
// Called once as the viewer starts: a log that already ends, and a message
// file no newer than that log, are left over from an earlier run. The message
// file is then read only from what is appended or rewritten later.
void MarkLeftovers(RunFiles& run);
// The kill files that cancel the run: stem._kill_, or under a launcher one
// stem_p<id>._kill_ for each stem_p<id>._spi_ in the folder.
std::vector<std::string> KillFiles(const RunFiles& run);

// Applies one record line ("TAG value") to the state; false if it is none.
bool ApplyRecord(const std::string& line, ViewState& state, double nowWall);
// Reads what was appended since the last call. A file that was re-created,
// cut short or rewritten starts the state afresh. Returns true when a record
// was read.
bool PollMessageFile(RunFiles& run, ViewState& state, double nowWall);

enum class RunEnd { Running, Successful, Abnormal };
// The end of the run as the last non-empty line of a log tells it.
RunEnd ReadRunEnd(const std::string& logFile);
// The end of the followed run: a leftover log counts only once rewritten.
RunEnd CheckRunEnd(RunFiles& run);

FileMark MarkOf(const std::string& path);
