// The data-file layer of the model: everything the model wants to know of a
// data file in one plain record, XolFile, filled at open and read from the
// record afterwards. Files are read item by item and step by step, written
// likewise, and summarised in the log.
//
// A call with a status pointer gives 0 or the code of its failure and
// returns; without one, a failure stops the run with "TRNXOL Error: " and the
// text of the code, the file and the reason the data-file library gives
// ("TRNXOL Error: Unable to read dynamic item: bed.xol2: no more data: ...").
// Either way the record keeps that whole text in lastErrorText.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/xolio/xolio.hpp"

constexpr int32_t kUnsetInteger = -91863;
constexpr float kDeleteValue = -1.0e-30f;

struct XolAxis {
    int32_t count = kUnsetInteger;
    float spacing = kDeleteValue;
    float origin = kDeleteValue;
    int32_t unit = 1000;
    std::string unitText = "meter";
};

struct XolItem {
    int32_t type = 999;
    std::string name;      // at most 32 characters
    int32_t unit = 0;      // the unit the caller or the file gave
    int32_t baseUnit = 0;  // the type's base unit: what reads deliver and writes expect
    int32_t dataType = 1;
    double minimum = kDeleteValue, maximum = kDeleteValue;
    int32_t missing = kUnsetInteger;
    std::string typeText = "Unknown";
    std::string unitText = "Unknown";
    std::vector<XolAttribute> attributes;  // further attributes a file written gets
};

struct XolFile {
    std::string appTitle;  // at most 40 characters
    int32_t appVersion = 0;
    std::string title;  // at most 80 characters
    int32_t dimension = 0;
    int32_t noDynamicItems = 1;
    int32_t noStaticItems = 0;
    int32_t dataType = 0;
    float deleteValue = kDeleteValue;
    std::vector<XolItem> dynamicItems;  // item n at index n - 1
    std::vector<XolItem> staticItems;
    XolAxis axes[4];
    int32_t timeAxisType = kUnsetInteger;  // 1 relative, 3 calendar
    int32_t timeUnit = 1400;
    std::string startDateTime;  // "YYYY-MM-DD hh:mm:ss" on a calendar axis
    double startOffset = kDeleteValue;
    double timeStep = 0.0;
    int32_t noTimeSteps = kUnsetInteger;
    std::string timeUnitText = "sec";
    float misc[7] = {kDeleteValue, kDeleteValue, kDeleteValue, kDeleteValue,
                     kDeleteValue, kDeleteValue, kDeleteValue};
    double longitude = kDeleteValue, latitude = kDeleteValue, orientation = kDeleteValue;
    std::string projection;  // at most 1024 characters
    XolHandle header = 0, file = 0;
    int32_t position = kUnsetInteger;  // <0 statics ahead; 0 created; >=1 next dynamic item + 1
    int32_t lastError = 0;
    std::string lastErrorText;  // the text of the last failure, as a stop gives it
    int32_t mode = 0;           // 1 reading, 2 writing, 3 closed
    std::string path;
};

// Codes of the layer's failures.
enum XolCode {
    kXolOpenFailed = 101,
    kXolBadFileType = 102,
    kXolBadItemNumber = 103,
    kXolNoStaticCount = 104,
    kXolBadItem = 105,
    kXolBadAxis = 106,
    kXolBadTimeAxis = 107,
    kXolNoCustomBlock = 108,
    kXolNoMemory = 111,
    kXolStaticRead = 201,
    kXolDynamicRead = 202,
    kXolStaticAfterDynamic = 203,
    kXolSkip = 204,
    kXolFlush = 205,
    kXolClose = 206,
    kXolCreateHeader = 301,
    kXolCreateFile = 302,
    kXolStaticWrite = 401,
    kXolDynamicWrite = 402,
    kXolStaticWriteAfterDynamic = 403,
    kXolNoStaticBlock = 501,
    kXolNoDynamicBlock = 502
};
// The text of a code; "Unknown error: N" for any other.
std::string XolErrorText(int code);

// Opens a file for reading. Besides what the data-file library refuses, a
// file whose item needs more memory than the machine has is refused.
XolFile XolOpenRead(const std::string& path, int* status = nullptr);
// Closes the file. A file being written that fails to close (its last data
// could not be written) stops the run, unless an earlier failure of the same
// file was recorded: that one is what the caller reports.
void XolClose(XolFile& file, int* status = nullptr);
void XolFlush(XolFile& file, int* status = nullptr);
void XolPrintSummary(const XolFile& file);

void XolGetTimeAxis(const XolFile& file, double& step, int32_t& steps, std::string* date = nullptr,
                    int32_t* timeUnit = nullptr);
void XolGetAxis(const XolFile& file, int axis, float& spacing, int32_t& count,
                float* origin = nullptr, int32_t* unit = nullptr, int* status = nullptr);
void XolReadDynamic(XolFile& file, float* values, int* status = nullptr);
void XolSkipDynamic(XolFile& file, int* status = nullptr);
void XolReadStatic(XolFile& file, float* values, int* status = nullptr);
// The number of values of an item: the product of the counts of the axes.
size_t XolItemValues(const XolFile& file);

// Stops the run when the dynamic item just read from the file holds a value
// that is not a finite number (NaN or infinity; the delete value is a
// number), naming the file, the item, the step (of a file of more than one)
// and the first such place: point (j,k) of a map, point i along a line.
void XolCheckFinite(const XolFile& file, const float* values);
// The same for steps first to last of a file that is read step by step
// during the run, so that it is refused at setup: items 1 to items of each
// step are checked, the others passed over.
void XolCheckFiniteSteps(const std::string& path, int32_t items, int32_t first, int32_t last);

// Optional arguments of XolCreateHeader.
struct XolHeaderOptions {
    float deleteValue = kDeleteValue;
    bool fileTypeFlag = false;  // file type 4 instead of 1
    std::string appTitle;       // empty: the program's name
    int32_t version = 0;
};
XolFile XolCreateHeader(const std::string& title, int32_t items, int32_t dimension,
                        const XolHeaderOptions& options = {}, int* status = nullptr);
void XolSetItem(XolFile& file, int32_t item, int32_t type, const std::string& name, int32_t unit,
                int* status = nullptr);
// An attribute of item's variable in the file written: a CF standard name, the
// place of a point. Set after XolSetItem, before XolCreateFile.
void XolSetItemAttribute(XolFile& file, int32_t item, const XolAttribute& attribute);
// start: "YYYY-MM-DD hh:mm:ss"; startOffset: seconds from it to the first
// record (a start between whole seconds).
void XolSetCalendarAxis(XolFile& file, double step, const std::string& start,
                        int32_t timeUnit = 1400, double startOffset = 0.0);
void XolSetAxis(XolFile& file, int axis, float spacing, float origin, int32_t count,
                int32_t unit = 1000);
void XolSetProjection(XolFile& file, const std::string& projection, double longitude,
                      double latitude, double orientation = 0.0);
void XolSetDataType(XolFile& file, int32_t value);
void XolSetMisc(XolFile& file, int index, float value);
void XolCreateFile(XolFile& file, const std::string& path, int* status = nullptr);
void XolWriteStatic(XolFile& file, const float* values, int32_t type = 999,
                    const std::string& name = "Static item", int32_t unit = 0,
                    int* status = nullptr);
void XolWriteDynamic(XolFile& file, const float* values, int* status = nullptr);

// The grid a map must lie on: spacings and highest indices.
struct GridShape {
    float dx = 0.0f, dy = 0.0f;
    int32_t J = 0, K = 0;
};
// Reads items 1 to item of a map on the model's grid into values, so that the
// selected item is what stays; stops the run on another grid, on another
// number of axes and on a selected item that holds a value that is not a
// finite number.
void ReadGridFile1D(const std::string& path, int32_t item, float* values, const GridShape& grid);
void ReadGridFile2D(const std::string& path, int32_t item, float* values, const GridShape& grid);
// A stop on what a file holds that a reader can't use: the reader's text,
// then the file and what it found there (": <path>: <detail>").
[[noreturn]] void XolStopOnContent(const std::string& text, const XolFile& file,
                                   const std::string& detail);
// Details for XolStopOnContent: "it has 2 spatial axes", "it holds 1 item
// where <wanted> are needed", "spacing 2 where the grid has 1".
std::string XolAxesFound(const XolFile& file);
std::string XolItemsFound(const XolFile& file, const std::string& wanted);
std::string XolSpacingFound(float found, float grid);
// A check the readers of maps and of the bathymetry add: the item number of
// a DATA_FILE section must select one of the file's items (0 would read none
// and leave the field as it was; a number beyond them would read into the
// next step).
void XolCheckItemNumber(const XolFile& file, int32_t item);
// Puts the range of an item just read (its values, the delete value left
// out) into the record, for the summary of a file read: a file that is only
// read has no range from the library.
void XolNoteItemRange(XolFile& file, int32_t item, const float* values);
// What a map's range check names behind its own text: ": <path>: <value> at
// point (j,k)", index counting x fastest over a grid of highest x index J.
std::string MapValueAt(const std::string& path, float value, size_t index, int32_t J);
