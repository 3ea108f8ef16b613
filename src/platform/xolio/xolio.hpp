// The data-file library: gridded, time-stepped files of 32-bit items, kept in
// NetCDF (classic format with 64-bit offsets, CF conventions) so that every file the
// engine reads or writes opens in the tools of the field.
//
// A file has a header (titles, delete value, data-type flag, time axis,
// projection, custom blocks), static items without time and dynamic items
// written step by step: within a step the items in their order. Handles are
// opaque 64-bit values; every call that returns int yields 0 on success.
//
// On disk: one variable per item (long_name = the item's name, units in CF
// text, _FillValue = the delete value, item_type and item_unit codes), a
// "time" coordinate and "x", "y", "z", "w" coordinates from origin and
// spacing; the header in global attributes. See docs/data-files.md.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

using XolHandle = uint64_t;

// Codes of this library's failures.
constexpr int kXolErrArgument = 1;  // a bad handle, item number or call order
constexpr int kXolErrOpen = 2;      // the file can't be opened or is no data file
constexpr int kXolErrFormat = 3;    // the file's content breaks the convention
constexpr int kXolErrWrite = 4;     // the library could not write
constexpr int kXolErrRead = 5;      // the library could not read
constexpr int kXolErrEnd = 6;       // no more data to read

// Axis types of an item: none, or equidistant in 1 to 4 dimensions.
constexpr int kXolAxisNone = 1;
constexpr int kXolAxisEq1 = 2;
constexpr int kXolAxisEq2 = 5;
constexpr int kXolAxisEq3 = 8;
constexpr int kXolAxisEq4 = 11;
// Time axis types.
constexpr int kXolTimeRelative = 1;
constexpr int kXolTimeCalendar = 3;

// A further attribute of an item's variable (a CF standard name, the place of
// a point): a text, or numbers.
struct XolAttribute {
    std::string name;
    std::string text;
    std::vector<double> values;
};

// The last failure's text.
const char* xolLastErrorText();

// ---- writing ---------------------------------------------------------------
int xolHeaderCreate(int fileType, const std::string& title, const std::string& appTitle,
                    int version, int dynamicItems, int statisticsType, XolHandle* header);
int xolSetDeleteValFloat(XolHandle header, float value);
int xolSetDataType(XolHandle header, int dataType);
// date "YYYY-MM-DD", time "hh:mm:ss"; the step in the time unit.
int xolSetEqCalendarAxis(XolHandle header, const std::string& date, const std::string& time,
                         int timeUnit, double startOffset, double step, int startIndex);
int xolSetEqTimeAxis(XolHandle header, int timeUnit, double startOffset, double step,
                     int startIndex);
int xolSetGeoInfoUTMProj(XolHandle header, const std::string& projection, double longitude,
                         double latitude, double orientation);
// Dynamic item n (from 1) of a header.
XolHandle xolItemD(XolHandle header, int n);
int xolSetItemInfo(XolHandle item, int type, const std::string& name, int unit, int dataType);
// Values pass in this unit: written values are converted to the item's unit,
// read values from it. Mode 3 is the only mode.
// Adds an attribute to the item's variable, or replaces the one of that name.
int xolSetItemAttribute(XolHandle item, const XolAttribute& attribute);
int xolSetItemUnitConversion(XolHandle item, int mode, int unit);
int xolSetItemAxisEqD0(XolHandle item, int unit);
int xolSetItemAxisEqD1(XolHandle item, int unit, int nx, float x0, float dx);
int xolSetItemAxisEqD2(XolHandle item, int unit, int nx, int ny, float x0, float y0, float dx,
                       float dy);
int xolSetItemAxisEqD3(XolHandle item, int unit, int nx, int ny, int nz, float x0, float y0,
                       float z0, float dx, float dy, float dz);
int xolAddCustomBlock(XolHandle header, int dataType, const std::string& name, int count,
                      const float* values);
int xolFileCreate(const std::string& path, XolHandle header, XolHandle* file);
XolHandle xolStaticCreate(XolHandle header);
XolHandle xolItemS(XolHandle staticItem);
int xolStaticWrite(XolHandle file, XolHandle staticItem, const float* values);
int xolStaticDestroy(XolHandle staticItem);
// The next item of the stream; time is taken from the header's time axis.
int xolWriteItemTimeStep(XolHandle header, XolHandle file, double time, const float* values);
int xolFileFlush(XolHandle file);
int xolFileClose(XolHandle file);
int xolHeaderDestroy(XolHandle header);

// ---- reading ---------------------------------------------------------------
int xolFileRead(const std::string& path, XolHandle* header, XolHandle* file);
int xolGetFileType(XolHandle header);
std::string xolGetFileTitle(XolHandle header);
float xolGetDeleteValFloat(XolHandle header);
int xolGetDataType(XolHandle header);
std::string xolGetAppTitle(XolHandle header);
int xolGetAppVersionNo(XolHandle header);
// Custom blocks form a chain: the first, then each one's next, 0 at the end.
XolHandle xolGetCustomBlockRef(XolHandle header);
int xolGetCustomBlock(XolHandle block, int* dataType, std::string* name, int* count,
                      const float** values, XolHandle* next);
// 1 when the file holds a projection.
int xolGetGeoInfoType(XolHandle header);
int xolGetGeoInfoUTMProj(XolHandle header, std::string* projection, double* longitude,
                         double* latitude, double* orientation);
int xolGetNoOfItems(XolHandle header);
int xolGetItemInfo(XolHandle item, int* type, std::string* name, int* unit, int* dataType);
int xolGetItemDim(XolHandle item);
int xolGetItemAxisType(XolHandle item);
int xolGetItemAxisEq(XolHandle item, int* unit, int counts[4], float origins[4], float spacings[4]);
int xolGetTimeAxisType(XolHandle header);
int xolGetEqTimeAxis(XolHandle header, int* timeUnit, double* startOffset, double* step, int* steps,
                     int* startIndex);
int xolGetEqCalendarAxis(XolHandle header, std::string* date, std::string* time, int* timeUnit,
                         double* startOffset, double* step, int* steps, int* startIndex);
int xolGetItemStatsGlobal(XolHandle item, double* minimum, double* maximum, long* missing);
int xolFindBlockDynamic(XolHandle file);
int xolReadItemTimeStep(XolHandle header, XolHandle file, double* time, float* values);
int xolSkipItem(XolHandle header, XolHandle file);
int xolFindBlockStatic(XolHandle file);
// The next static item, or 0 after the last.
XolHandle xolStaticRead(XolHandle file);
int xolStaticGetData(XolHandle staticItem, float* values);
