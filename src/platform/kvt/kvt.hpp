// The parameter library: a parameter file held in memory as a tree of
// targets, sections (nested to any depth), keywords and parameters.
//
// File syntax:
//   # a comment runs from '#' to the end of the line
//   TARGET_NAME {                 a target: a name and a block
//       Section {                 sections nest to any depth
//           Key = 1, 2.5, true    one keyword a line, one or more parameters
//           Text = "a \"b\" \\"   text: double quotes, \" and \\ inside
//                                 (a backslash before anything else is itself)
//           Data = file("x.nc")   a file name, relative to the file's folder
//       }
//   }
// Names are a letter or '_' followed by letters, digits and '_', matched as
// written. Integers are like -12; reals hold a '.' or an exponent (0.05,
// 1.0e-4, 3.), or are inf, -inf or nan; logicals are true or false in any
// letter case. Names of equal spelling count as instances 1, 2, ... in file
// order, and the order of everything is kept.
//
// Handles are opaque 64-bit values; 0 means absent. Every look-up and value
// call sets the global error code: 0 on success, else one of the codes below.
// kvtPeekErrorGlb reads it without clearing it.
#pragma once

#include <cstdint>

using KvtHandle = uint64_t;

constexpr int kKvtOk = 0;
constexpr int kKvtErrFile = 1001;      // the file can't be read or written
constexpr int kKvtErrHandle = 1002;    // a null, closed or unfit handle
constexpr int kKvtErrSyntax = 1003;    // a syntax error in a loaded file
constexpr int kKvtErrNotFound = 1004;  // a look-up found nothing
constexpr int kKvtErrKind = 1005;      // a parameter of another kind than asked
constexpr int kKvtErrRange = 1006;     // an integer outside the 32-bit range
constexpr int kKvtErrName = 1007;      // a name that breaks the naming rule
constexpr int kKvtErrBuild = 1008;     // a building call out of order

// Reading.
// Loads a file; the option word has no meaning. A syntax error still gives a
// handle (of what was read before it) with the error code 1003 pending.
// Returns 0 when the file can't be read.
KvtHandle kvtLoadFile(const char* path, int option, KvtHandle* file);
// Why the last kvtLoadFile gave 0: the system's text ("Permission denied",
// "Is a directory", ...), "not a regular file" for a device or a pipe, and ""
// when the file does not exist (no such name, or a folder on the way is a
// file) or the load succeeded.
const char* kvtGetFileErrorText();
// Parses a text as if it were the file at path (path sets the folder that
// relative file names are resolved against; null: the working folder).
KvtHandle kvtLoadText(const char* text, uint64_t length, const char* path, KvtHandle* file);
int kvtPeekErrorGlb();
// The last syntax error: line and column from 1, and a short text of what was
// expected; 0, 0 and "" after a clean load.
void kvtGetSyntaxErr(KvtHandle file, int* line, int* column, const char** text);

KvtHandle kvtTargetByNameNum(KvtHandle file, const char* name, int instance);
KvtHandle kvtSectionByNameNum(KvtHandle parent, const char* name, int instance);
KvtHandle kvtKeywordByNameNum(KvtHandle section, const char* name, int instance);
KvtHandle kvtParamByNum(KvtHandle keyword, int number);
// The number of parameters of a keyword.
int kvtParamCount(KvtHandle keyword);
// As kvtKeywordByNameNum, but it neither marks the keyword nor records the
// name: for checks that are not reads of a setting.
KvtHandle kvtKeywordPeek(KvtHandle section, const char* name, int instance);

// Read marks. The three look-ups by name mark the node they find as read and
// record the name asked for in the node searched, found or not; walking by
// number marks nothing. What a run left unread is then known: see
// kvtReportUnread.
bool kvtIsRead(KvtHandle node);
// The number-th name (from 1) asked for in a file (names of targets), a
// target or a section, each once, in the order first asked; keyword tells a
// keyword's name from a section's. Null and kKvtErrNotFound past the last.
// The text stays valid until kvtClose.
const char* kvtGetAskedName(KvtHandle node, int number, bool* keyword);
// The line (from 1) where the name of a target, section or keyword stands in
// the loaded file; 0 in a tree built in memory.
int kvtGetLine(KvtHandle node);

// Walking a tree in file order without knowing its names: the number-th child
// (from 1) of a file (its targets), of a target or section (its sections and
// keywords, mixed as they stand) or of a keyword (its parameters). Null with
// kKvtErrNotFound past the last one.
KvtHandle kvtChildByNum(KvtHandle node, int number);
// True for a keyword; false for a file, target, section or parameter.
bool kvtIsKeyword(KvtHandle node);

// Depth in the tree: a target is at level 0, its sections at 1, and so on.
int kvtGetLevel(KvtHandle node);
// The path from the target down, names joined by '.': "TARGET.Section.Sub".
const char* kvtGetNameGlb(KvtHandle node);
// The name of a target, section or keyword.
const char* kvtGetName(KvtHandle node);

bool kvtIsInt(KvtHandle param);
bool kvtIsReal(KvtHandle param);
bool kvtIsBool(KvtHandle param);
bool kvtIsString(KvtHandle param);
bool kvtIsFilename(KvtHandle param);

// Values. An integer may be read as a real; a text may be read as a file
// name. Every other mismatch sets kKvtErrKind and returns 0, false or null.
int32_t kvtGetInt(KvtHandle param);
// A real or integer rounded to the nearest 32-bit real (beyond its range: infinity).
float kvtGetFloat(KvtHandle param);
double kvtGetDouble(KvtHandle param);
bool kvtGetBool(KvtHandle param);
const char* kvtGetString(KvtHandle param);
const char* kvtGetFilename(KvtHandle param);
// The file name as a full path (at most 2047 characters): relative names are
// taken from the folder of the file that holds them (the working folder for a
// tree built in memory); absolute ones stay. A longer path gives null and
// kKvtErrRange.
const char* kvtGetResultFilenamePath(KvtHandle param);
// The parameter in the file's syntax, for messages: integers in full, reals
// in the shortest form that reads back the same, texts quoted and escaped,
// file names as file("name").
const char* kvtGetParamText(KvtHandle param);

// What a run left unread, once it has read its settings, in file order: a
// target, section or keyword never found by a look-up by name ("is not read
// by this run", with the nearest name of its kind asked for in the same
// parent when one is close; nothing inside an unread section), and a second
// instance of a name of which another instance was read ("is given twice").
// Calls report with each text (without a closing period) and returns their
// number. Given a target or section instead of the file, only what stands
// inside it is reported, as a reader does that stops on a value of its own.
using KvtReportFn = void (*)(const char* text, void* data);
int kvtReportUnread(KvtHandle file, KvtReportFn report, void* data);

// Ends a tree, loaded or built, and sets the handle to 0. Only the file handle
// ends a tree; any other handle is refused with kKvtErrHandle.
void kvtClose(KvtHandle* file);

// Writing.
KvtHandle kvtCreate(KvtHandle* file);
int kvtAddTarget(KvtHandle file, const char* name);
int kvtAddSection(KvtHandle file, const char* name);
// Ends the section (or target) opened last.
int kvtEndSection(KvtHandle file);
int kvtAddKeyword(KvtHandle file, const char* name);
// Each adds one more parameter to the keyword added last. A null text, or one
// with a line break, is refused with kKvtErrBuild.
int kvtAddInt(KvtHandle file, int32_t value);
int kvtAddFloat(KvtHandle file, float value);
int kvtAddDouble(KvtHandle file, double value);
int kvtAddBool(KvtHandle file, bool value);
int kvtAddString(KvtHandle file, const char* value);
int kvtAddFilename(KvtHandle file, const char* value);
// Writes the tree in the syntax above, four blanks a level; doubles with 17
// and 32-bit reals with 9 significant digits, so that it loads back the same.
// A keyword without parameters can't be written: kKvtErrBuild, no file.
int kvtWrite(KvtHandle file, const char* path);
