// Parameter access layer, explicit face: every setting of the model file is
// read through these calls, which add to the bare parameter library
//  - a default for every key: what the value holds on entry stands when the
//    key is absent, and an absent key is never an error;
//  - a fatal stop on a missing file, target or section, unless the caller
//    passes a status and decides for itself;
//  - an echo of every value into the run's log, defaults marked " (default)",
//    so that the log records every setting in force;
//  - values in the model's own widths;
//  - without a status, a fatal stop on a present key whose value can't be
//    meant: of the wrong kind, an integer beyond 32 bits, a real that is nan
//    or infinite (or beyond the 32-bit range where a 32-bit real is read),
//    fewer values than are read. The message names the getter, the key, its
//    section, its line, the values as written and what is allowed.
// A status, where given, is 0 when the key was there and its value taken,
// 1 when it was absent or has no such parameter, else the library's code;
// then nothing is refused and a value that can't be taken keeps the default.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/kvt/kvt.hpp"

struct KvtAccessState {
    int logUnit = -1;           // above 0: the log is open and values are echoed
    std::string logName;        // the log's path, once opened
    KvtHandle currentFile = 0;  // the file and node of the current-section face
    KvtHandle currentNode = 0;
    int targetInstance = 1;   // the instance last given to the current face's KvtOpenTarget
    std::string loadFailure;  // why the last KvtOpenFile could not load its file
};
extern KvtAccessState gKvtAccess;

// Loads the parameter file and, with makeLog, opens the log beside it: the
// path with its extension replaced by ".log" (appended where there is none),
// and "_p" with the process id behind the stem under a launcher. Without a
// status a file that is absent stops with "KVT file: <path>not found", one
// that is there but can't be read with "KVT file: <path> can not be read:
// <reason>".
KvtHandle KvtOpenFile(std::string_view path, bool makeLog, int* status = nullptr);
// Why the last KvtOpenFile could not load its file: the system's text
// ("Permission denied", "Is a directory", ...); "" when the file does not
// exist or the load succeeded.
std::string KvtLoadFailure();
// The log's name for a parameter file path.
std::string LogFileName(std::string_view path);

KvtHandle KvtOpenTarget(KvtHandle file, std::string_view name, int instance = 1,
                        int* status = nullptr);
KvtHandle KvtOpenSection(KvtHandle parent, std::string_view name, int instance = 1,
                         int* status = nullptr);

void KvtGetDouble(KvtHandle section, std::string_view key, double& value, int instance = 1,
                  int param = 1, int* status = nullptr);
void KvtGetReal(KvtHandle section, std::string_view key, float& value, int instance = 1,
                int param = 1, int* status = nullptr);
void KvtGetInteger(KvtHandle section, std::string_view key, int32_t& value, int instance = 1,
                   int param = 1, int* status = nullptr);
void KvtGetLogical(KvtHandle section, std::string_view key, bool& value, int instance = 1,
                   int param = 1, int* status = nullptr);
// Texts and paths: width > 0 cuts the value to that many characters and pads
// it with blanks, as the fixed-width fields of the model (paths 256, titles 40 or 80).
void KvtGetString(KvtHandle section, std::string_view key, std::string& value, int width = 0,
                  int instance = 1, int param = 1, int* status = nullptr);
// The value is the full path of the file name; the echo shows only the name
// behind the last folder separator when TRNLIB_LOG_NOPATH is set.
void KvtGetFilename(KvtHandle section, std::string_view key, std::string& value, int width = 0,
                    int instance = 1, int param = 1, int* status = nullptr);
// The value of a text or file-name key, fitted to width as above and with its
// trailing blanks cut; the fallback stands when the key is absent from a
// section that allows it.
std::string KvtTrimmedString(KvtHandle section, std::string_view key, int width,
                             std::string fallback = "");
std::string KvtTrimmedFilename(KvtHandle section, std::string_view key, int width);
// Parameters 1 to count of the first instance of the key.
void KvtGetIntegerList(KvtHandle section, std::string_view key, int32_t* values, int count,
                       int* status = nullptr);
void KvtGetDoubleList(KvtHandle section, std::string_view key, double* values, int count,
                      int* status = nullptr);

// The number of parameters of the first instance of a key, 0 when it is
// absent; no echo, and the key does not count as read (a count key is
// weighed against the list it sizes before the list is read).
int KvtParamCount(KvtHandle section, std::string_view key);

// Once the whole model is read: a warning, in the log and on the screen, for
// each target, section or keyword of the file that no look-up found (with the
// nearest name the run asked for in its place, when one is close) and for
// each repeat of a name of which one instance was read.
// Given a section instead of the file, the same for what it holds: a reader
// that stops on a value of a section it has read says first what it did not
// read there, since a misspelt key is the likely cause of a default that
// can't be meant.
void KvtWarnUnread(KvtHandle file);

// Writes one line into the log of this layer (nothing when it is not open).
void KvtLogLine(std::string_view text);
