// The records behind the data-file library's handles.
#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <vector>

#include "platform/xolio/xolio.hpp"

struct XolItemRec {
    int type = 999;
    std::string name;
    int unit = 0;       // the unit of the values on disk
    int dataType = 1;   // 1: 32-bit floats
    int passUnit = -1;  // the unit values pass in, when a conversion is set
    int axisType = kXolAxisNone;
    int axisUnit = 1000;
    int dims = 0;
    int count[4] = {1, 1, 1, 1};
    float origin[4] = {0, 0, 0, 0};
    float spacing[4] = {0, 0, 0, 0};
    double first[4] = {0, 0, 0, 0};  // the first coordinate of each axis in a file read
    // Statistics of what was written.
    double minimum = 0.0, maximum = 0.0;
    long missing = 0;
    bool anyValue = false;
    std::vector<XolAttribute> attributes;  // further attributes of the variable
    // On disk.
    int varid = -1;
    struct XolFileRec* source = nullptr;  // the open file a read item comes from

    size_t Size() const {
        size_t n = 1;
        for (int d = 0; d < dims; ++d) n *= static_cast<size_t>(count[d]);
        return n;
    }
};

struct XolBlock {
    int dataType = 1;
    std::string name;
    std::vector<float> values;
    XolHandle next = 0;
};

struct XolHeaderRec {
    int fileType = 1;
    std::string title, appTitle;
    int version = 0;
    int statisticsType = 1;
    float deleteValue = -1.0e-30f;
    int dataType = 0;
    int timeType = kXolTimeRelative;
    std::string date = "1970-01-01", time = "00:00:00";
    int timeUnit = 1400;
    double startOffset = 0.0, step = 1.0;
    int startIndex = 0;
    int steps = 0;
    bool geo = false;
    std::string projection;
    double longitude = 0.0, latitude = 0.0, orientation = 0.0;
    std::deque<XolBlock> blocks;
    std::vector<XolItemRec> items;                    // dynamic items, fixed at creation
    std::deque<std::unique_ptr<XolItemRec>> statics;  // static items, in order
};

struct XolFileRec {
    int ncid = -1;
    XolHeaderRec* header = nullptr;
    bool writing = false;
    std::string path;
    int timeVar = -1;
    size_t nextItem = 0;      // the item of the stream that comes next
    size_t step = 0;          // the step it belongs to
    size_t staticCursor = 0;  // the next static item to hand out when reading
    bool timeless = false;    // a file without a time dimension: one step
    uint64_t frame = 0;       // the map frame of a file on a real map projection, when writing
};

// Handle checks: the record of a live handle, or nullptr.
XolHeaderRec* XolHeaderOf(XolHandle handle);
XolFileRec* XolFileOf(XolHandle handle);
XolItemRec* XolItemOf(XolHandle handle);
XolHandle XolRegister(XolHeaderRec* header);
XolHandle XolRegister(XolFileRec* file);
XolHandle XolRegister(XolItemRec* item);
void XolForget(const void* record);
// Keeps text as the last failure's reason (what xolLastErrorText gives) and returns code.
int XolFail(int code, const std::string& text);

// A failure of the NetCDF library: its text for status, after what where given.
int XolNcFail(int code, int status, const std::string& what = "");
// Converts n values between the item's unit on disk and the unit they pass in
// (toDisk: for writing), delete values left as they are.
void XolConvert(const XolItemRec& item, float* values, size_t n, bool toDisk, float deleteValue);

// The operating system's text of an errno value, starting in lower case.
std::string XolSystemText(int error);
// Checks a file before the NetCDF library opens it (xolio_check.cpp): 0, or
// the code of the failure with its reason. fileSize is the file's size.
int XolCheckFile(const std::string& path, uint64_t& fileSize);
