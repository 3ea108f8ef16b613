#include "data/xolfile.hpp"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>

#include "platform/qty/qty.hpp"
#include "run/memory.hpp"
#include "run/messages.hpp"

namespace {

std::string Cut(const std::string& text, size_t width) {
    return text.size() > width ? text.substr(0, width) : text;
}

std::string UnitText(int32_t unit) {
    std::string text;
    qtyGetUnitKey(unit, text);
    return text;
}

std::string TypeText(int32_t type) {
    std::string text;
    qtyGetItemTypeKey(type, text);
    return text;
}

// The base unit of a type: the first of its sequence; an undefined type keeps the unit given.
bool BaseUnit(int32_t type, int32_t unit, int32_t& base) {
    std::string text;
    if (type == 999) {
        base = unit;
        return true;
    }
    return qtyGetItemUnitSeq(type, 1, base, text);
}

// An item entry as a writer describes it.
XolItem MakeItem(int32_t type, const std::string& name, int32_t unit) {
    XolItem item;
    item.type = type;
    item.name = Cut(name, 32);
    item.unit = unit;
    if (!BaseUnit(type, unit, item.baseUnit)) item.baseUnit = unit;
    item.typeText = TypeText(type);
    item.unitText = UnitText(item.baseUnit);
    return item;
}

// A failure: its text is the lead (by default "TRNXOL Error: ", the text of
// the code and the file), then the reason. Into the status when there is
// one, else the stop of the run.
void Fail(XolFile& file, int code, int* status, const std::string& reason,
          const std::string& lead = "") {
    std::string text = lead;
    if (text.empty()) {
        text = "TRNXOL Error: " + XolErrorText(code);
        if (!file.path.empty()) text += ": " + std::string(Trim(file.path));
    }
    if (!reason.empty()) text += ": " + reason;
    file.lastError = code;
    file.lastErrorText = text;
    if (status != nullptr) {
        *status = code;
        return;
    }
    StopRun(text);
}

// The reason the data-file library gave for its last failure.
std::string LibraryReason() {
    return xolLastErrorText();
}

std::string ItemText(int n, const std::string& name) {
    return (n < 0 ? "static item " + std::to_string(-n) : "item " + std::to_string(n)) + " \"" +
           name + "\"";
}

void Succeed(int* status) {
    if (status != nullptr) *status = 0;
}

// Reads the description of an item: its entry, and its axes, which for the
// first item set the file's and for all others must equal them exactly.
int ReadItem(XolFile& f, XolHandle handle, int n, XolItem& item, std::string& why) {
    std::string name;
    int type = 0, unit = 0, dataType = 0;
    if (xolGetItemInfo(handle, &type, &name, &unit, &dataType) != 0) {
        why = LibraryReason();
        return kXolBadItem;
    }
    const int dim = xolGetItemDim(handle);
    if (n == 1) {
        f.dimension = dim;
    } else if (dim != f.dimension) {
        why = ItemText(n, name) + " has " + std::to_string(dim) +
              " spatial axes where item 1 has " + std::to_string(f.dimension);
        return kXolBadItem;
    }
    if (dataType != 1) {
        why = ItemText(n, name) + " is not of 32-bit floats";
        return kXolBadItem;
    }
    item.type = type;
    item.name = Cut(name, 32);
    item.unit = unit;
    item.dataType = dataType;
    if (!BaseUnit(type, unit, item.baseUnit)) {
        why = ItemText(n, name) + " has the type " + std::to_string(type) +
              ", which this engine does not know";
        return kXolBadItem;
    }
    xolSetItemUnitConversion(handle, 3, item.baseUnit);
    item.typeText = TypeText(type);
    item.unitText = UnitText(item.baseUnit);
    const int axisType = xolGetItemAxisType(handle);
    int axisUnit = 0, counts[4];
    float origins[4], spacings[4];
    if ((axisType != kXolAxisNone && axisType != kXolAxisEq1 && axisType != kXolAxisEq2 &&
         axisType != kXolAxisEq3 && axisType != kXolAxisEq4) ||
        xolGetItemAxisEq(handle, &axisUnit, counts, origins, spacings) != 0) {
        why = ItemText(n, name) + " has axes of an unknown kind";
        return kXolBadAxis;
    }
    for (int d = 0; d < dim && d < 4; ++d) {
        XolAxis axis;
        axis.count = counts[d];
        axis.spacing = spacings[d];
        axis.origin = origins[d];
        axis.unit = axisUnit;
        axis.unitText = UnitText(axisUnit);
        if (n == 1) {
            f.axes[d] = axis;
        } else if (f.axes[d].count != axis.count || f.axes[d].origin != axis.origin ||
                   f.axes[d].spacing != axis.spacing) {
            why = ItemText(n, name) + " lies on other axes than item 1";
            return kXolBadAxis;
        }
    }
    return 0;
}

int OpenSteps(XolFile& f, std::string& why) {
    const XolHandle h = f.header;
    std::string startDate = "1970-01-01", startTime = "00:00:00";
    int unit = 0, steps = 0, startIndex = 0;
    double offset = 0.0, step = 0.0;
    int code = 0;
    f.timeAxisType = xolGetTimeAxisType(h);
    if (f.timeAxisType == kXolTimeRelative) {
        code = xolGetEqTimeAxis(h, &unit, &offset, &step, &steps, &startIndex);
    } else if (f.timeAxisType == kXolTimeCalendar) {
        code = xolGetEqCalendarAxis(h, &startDate, &startTime, &unit, &offset, &step, &steps,
                                    &startIndex);
        f.startDateTime = startDate + " " + startTime;
    } else {
        why = "time axis type " + std::to_string(f.timeAxisType) +
              " is neither relative (1) nor calendar (3)";
        return kXolBadTimeAxis;
    }
    if (code != 0) {
        why = LibraryReason();
        return kXolBadTimeAxis;
    }
    f.timeUnit = unit;
    f.timeUnitText = UnitText(unit);
    f.startOffset = offset;
    f.timeStep = step;
    f.noTimeSteps = steps;
    return 0;
}

int OpenItems(XolFile& f, std::string& why) {
    const XolHandle h = f.header;
    if (xolGetFileType(h) != 1) {
        why = "file type " + std::to_string(xolGetFileType(h)) + ", where this engine reads type 1";
        return kXolBadFileType;
    }
    f.title = Cut(xolGetFileTitle(h), 80);
    f.deleteValue = xolGetDeleteValFloat(h);
    f.dataType = xolGetDataType(h);
    f.appTitle = Cut(xolGetAppTitle(h), 40);
    f.appVersion = xolGetAppVersionNo(h);
    for (XolHandle block = xolGetCustomBlockRef(h); block != 0;) {
        int type = 0, count = 0;
        std::string name;
        const float* values = nullptr;
        xolGetCustomBlock(block, &type, &name, &count, &values, &block);
        if (TrimRight(name) == "TRN_Misc") {
            for (int i = 0; i < 7 && i < count; ++i) f.misc[i] = values[i];
            break;
        }
    }
    if (xolGetGeoInfoType(h) == 1)
        xolGetGeoInfoUTMProj(h, &f.projection, &f.longitude, &f.latitude, &f.orientation);
    f.noDynamicItems = xolGetNoOfItems(h);
    if (f.noDynamicItems <= 0) {
        why = "the file holds no dynamic items";
        return kXolBadItemNumber;
    }
    f.dynamicItems.assign(static_cast<size_t>(f.noDynamicItems), XolItem{});
    if (int code = OpenSteps(f, why)) return code;

    f.noStaticItems = 0;
    xolFindBlockStatic(f.file);
    std::vector<XolHandle> statics;
    for (XolHandle st; (st = xolStaticRead(f.file)) != 0; ++f.noStaticItems) statics.push_back(st);
    for (int n = 1; n <= f.noDynamicItems; ++n)
        if (int code =
                ReadItem(f, xolItemD(h, n), n, f.dynamicItems[static_cast<size_t>(n - 1)], why))
            return code;
    f.staticItems.assign(static_cast<size_t>(f.noStaticItems), XolItem{});
    for (int n = 1; n <= f.noStaticItems; ++n)
        if (int code = ReadItem(f, xolItemS(statics[static_cast<size_t>(n - 1)]), -n,
                                f.staticItems[static_cast<size_t>(n - 1)], why))
            return code;
    return 0;
}

// The item of the most values must fit in the machine's memory, as every
// reader holds a whole item at a time.
void CheckItemMemory(XolFile& f, int* status) {
    std::string counts;
    for (int d = 0; d < f.dimension && d < 4; ++d)
        counts += (d > 0 ? " x " : "") + std::to_string(f.axes[d].count);
    const double values = static_cast<double>(XolItemValues(f));
    const std::string what = "an item of " + counts + " points in " + std::string(Trim(f.path));
    if (status == nullptr) {
        CheckMemory(what, values, sizeof(float));
        return;
    }
    const double need = values * sizeof(float);
    const double have = static_cast<double>(MachineMemoryBytes());
    if (!(need > have)) return;
    char text[96];
    std::snprintf(text, sizeof text, " needs %.3g GB, the machine has %.3g GB", need / 1e9,
                  have / 1e9);
    Fail(f, kXolNoMemory, status, "", "Unable to allocate memory: " + what + text);
}

// Defines an item in the header before the file or the static item is written.
// why: the reason of a failure.
int DefineItem(XolFile& f, XolHandle handle, const XolItem& item, std::string& why) {
    int userUnit = item.unit;
    if (item.type != 999 && !qtyGetItemUserUnit(item.type, userUnit)) {
        why = "item \"" + item.name + "\" has the type " + std::to_string(item.type) +
              ", which this engine does not know";
        return kXolBadItem;
    }
    why = "item \"" + item.name + "\": ";
    if (xolSetItemInfo(handle, item.type, item.name, userUnit, 1) != 0) {
        why += LibraryReason();
        return kXolBadItem;
    }
    if (item.type != 999) xolSetItemUnitConversion(handle, 3, item.unit);
    const XolAxis* a = f.axes;
    int code = 0;
    switch (f.dimension) {
        case 0:
            code = xolSetItemAxisEqD0(handle, 1000);
            break;
        case 1:
            code = xolSetItemAxisEqD1(handle, a[0].unit, a[0].count, a[0].origin, a[0].spacing);
            break;
        case 2:
            code = xolSetItemAxisEqD2(handle, a[0].unit, a[0].count, a[1].count, a[0].origin,
                                      a[1].origin, a[0].spacing, a[1].spacing);
            break;
        case 3:
            code = xolSetItemAxisEqD3(handle, a[0].unit, a[0].count, a[1].count, a[2].count,
                                      a[0].origin, a[1].origin, a[2].origin, a[0].spacing,
                                      a[1].spacing, a[2].spacing);
            break;
        default:
            why += std::to_string(f.dimension) + " spatial axes, more than three";
            return kXolBadAxis;
    }
    if (code != 0) {
        why += LibraryReason();
        return kXolBadAxis;
    }
    for (const XolAttribute& attribute : item.attributes) xolSetItemAttribute(handle, attribute);
    why.clear();
    return 0;
}

}  // namespace

std::string XolErrorText(int code) {
    switch (code) {
        case 101:
            return "Unable to open XOL file";
        case 102:
            return "Invalid type of XOL file";
        case 103:
            return "Invalid item number";
        case 104:
            return "Unable to detect number of static items";
        case 105:
            return "Invalid item";
        case 106:
            return "Invalid spatial axis";
        case 107:
            return "Invalid time axis";
        case 108:
            return "Unable to add custom block";
        case 111:
            return "Unable to allocate memory";
        case 201:
            return "Unable to read static item";
        case 202:
            return "Unable to read dynamic item";
        case 203:
            return "Static read call after dynamic";
        case 204:
            return "Unable to skip data";
        case 205:
            return "Unable to flush file";
        case 206:
            return "Unable to close file";
        case 301:
            return "Unable to create header";
        case 302:
            return "Unable to create file";
        case 401:
            return "Unable to write static item";
        case 402:
            return "Unable to write dynamic item";
        case 403:
            return "Static write call after dynamic";
        case 501:
            return "Unable to locate static block";
        case 502:
            return "Unable to locate dynamic block";
        default:
            return "Unknown error: " + std::to_string(code);
    }
}

XolFile XolOpenRead(const std::string& path, int* status) {
    XolFile f;
    f.appTitle = Cut(program_invocation_short_name, 40);
    f.path = path;
    const std::string name(Trim(path));
    if (xolFileRead(path, &f.header, &f.file) != 0) {
        Fail(f, kXolOpenFailed, status, LibraryReason(), "XOL open error on " + name);
        return f;
    }
    std::string why;
    if (int code = OpenItems(f, why)) {
        xolFileClose(f.file);
        xolHeaderDestroy(f.header);
        f.file = f.header = 0;
        Fail(f, code, status, why, XolErrorText(code) + " file: " + name);
        return f;
    }
    f.position = f.noStaticItems > 0 ? -1 : 1;
    f.mode = 1;
    CheckItemMemory(f, status);
    if (f.lastError != 0) {
        XolClose(f);
        return f;
    }
    Succeed(status);
    return f;
}

void XolClose(XolFile& f, int* status) {
    const bool failed = f.file != 0 && xolFileClose(f.file) != 0;
    const std::string reason = failed ? LibraryReason() : "";
    if (f.mode == 2) {
        std::string why;
        if (OpenSteps(f, why) != 0) f.lastError = kXolBadTimeAxis;
        for (int n = 1; n <= f.noDynamicItems; ++n) {
            XolItem& item = f.dynamicItems[static_cast<size_t>(n - 1)];
            long missing = 0;
            xolGetItemStatsGlobal(xolItemD(f.header, n), &item.minimum, &item.maximum, &missing);
            item.missing = static_cast<int32_t>(missing);
        }
    }
    xolHeaderDestroy(f.header);
    const bool writing = f.mode == 2;
    f.file = f.header = 0;
    f.mode = 3;
    // The last data of a file written go to disk as it closes; a failure
    // there is reported unless an earlier one of the same file was.
    if (failed && writing && f.lastError == 0) return Fail(f, kXolClose, status, reason);
    Succeed(status);
}

void XolFlush(XolFile& f, int* status) {
    if (xolFileFlush(f.file) == 0) return Succeed(status);
    Fail(f, kXolFlush, status, LibraryReason(), "Flush error: " + std::string(Trim(f.path)));
}

size_t XolItemValues(const XolFile& f) {
    size_t values = 1;
    for (int d = 0; d < f.dimension && d < 4; ++d)
        values *= static_cast<size_t>(std::max(f.axes[d].count, 1));
    return values;
}

void XolGetTimeAxis(const XolFile& f, double& step, int32_t& steps, std::string* date,
                    int32_t* timeUnit) {
    step = f.timeStep;
    steps = f.noTimeSteps;
    if (date != nullptr) *date = f.timeAxisType == kXolTimeCalendar ? f.startDateTime : "";
    if (timeUnit != nullptr) *timeUnit = f.timeUnit;
}

void XolGetAxis(const XolFile& f, int axis, float& spacing, int32_t& count, float* origin,
                int32_t* unit, int* status) {
    if (axis < 1 || axis > f.dimension) {
        XolFile& writable = const_cast<XolFile&>(f);
        Fail(writable, kXolBadAxis, status,
             "axis " + std::to_string(axis) + " asked of a file of " + std::to_string(f.dimension) +
                 " spatial axes");
        return;
    }
    const XolAxis& a = f.axes[axis - 1];
    spacing = a.spacing;
    count = a.count;
    if (origin != nullptr) *origin = a.origin;
    if (unit != nullptr) *unit = a.unit;
    Succeed(status);
}

void XolReadDynamic(XolFile& f, float* values, int* status) {
    if (f.position < 1) {
        if (xolFindBlockDynamic(f.file) != 0)
            return Fail(f, kXolNoDynamicBlock, status, LibraryReason());
        f.position = 1;
    }
    double time = 0.0;
    if (xolReadItemTimeStep(f.header, f.file, &time, values) != 0)
        return Fail(f, kXolDynamicRead, status, LibraryReason());
    ++f.position;
    Succeed(status);
}

void XolSkipDynamic(XolFile& f, int* status) {
    if (f.position < 1) {
        if (xolFindBlockDynamic(f.file) != 0)
            return Fail(f, kXolNoDynamicBlock, status, LibraryReason());
        f.position = 1;
    }
    if (xolSkipItem(f.header, f.file) != 0) return Fail(f, kXolSkip, status, LibraryReason());
    ++f.position;
    Succeed(status);
}

void XolReadStatic(XolFile& f, float* values, int* status) {
    if (f.position >= 0) return Fail(f, kXolStaticAfterDynamic, status, "");
    if (f.position == -1 && xolFindBlockStatic(f.file) != 0)
        return Fail(f, kXolNoStaticBlock, status, LibraryReason());
    const XolHandle st = xolStaticRead(f.file);
    if (st == 0)
        return Fail(f, kXolStaticRead, status,
                    "the file holds " + std::to_string(f.noStaticItems) + " static items");
    if (xolStaticGetData(st, values) != 0) return Fail(f, kXolStaticRead, status, LibraryReason());
    --f.position;
    xolStaticDestroy(st);
    Succeed(status);
}

XolFile XolCreateHeader(const std::string& title, int32_t items, int32_t dimension,
                        const XolHeaderOptions& options, int* status) {
    XolFile f;
    f.appTitle =
        Cut(options.appTitle.empty() ? program_invocation_short_name : options.appTitle, 40);
    f.appVersion = options.version;
    f.title = Cut(title, 80);
    f.dimension = dimension;
    f.noDynamicItems = items;
    f.deleteValue = options.deleteValue;
    f.dynamicItems.assign(static_cast<size_t>(items > 0 ? items : 0), XolItem{});
    const int fileType = options.fileTypeFlag ? 4 : 1;
    if (xolHeaderCreate(fileType, f.title, f.appTitle, f.appVersion, items, 1, &f.header) != 0) {
        f.dynamicItems.clear();
        Fail(f, kXolCreateHeader, status, LibraryReason());
        return f;
    }
    xolSetDeleteValFloat(f.header, f.deleteValue);
    Succeed(status);
    return f;
}

void XolSetItem(XolFile& f, int32_t n, int32_t type, const std::string& name, int32_t unit,
                int* status) {
    if (n < 1 || n > f.noDynamicItems)
        return Fail(f, kXolBadItemNumber, status,
                    "item " + std::to_string(n) + " of a file of " +
                        std::to_string(f.noDynamicItems) + " items");
    f.dynamicItems[static_cast<size_t>(n - 1)] = MakeItem(type, name, unit);
    Succeed(status);
}

void XolSetItemAttribute(XolFile& f, int32_t n, const XolAttribute& attribute) {
    if (n >= 1 && n <= f.noDynamicItems)
        f.dynamicItems[static_cast<size_t>(n - 1)].attributes.push_back(attribute);
}

void XolSetCalendarAxis(XolFile& f, double step, const std::string& start, int32_t timeUnit,
                        double startOffset) {
    const std::string text = start + std::string(19, ' ');
    f.timeAxisType = kXolTimeCalendar;
    f.startDateTime = Cut(start, 32);
    f.startOffset = startOffset;
    f.timeStep = step;
    f.timeUnit = timeUnit;
    f.timeUnitText = UnitText(timeUnit);
    xolSetEqCalendarAxis(f.header, text.substr(0, 10), text.substr(11, 8), timeUnit, startOffset,
                         step, 0);
}

void XolSetAxis(XolFile& f, int axis, float spacing, float origin, int32_t count, int32_t unit) {
    if (axis < 1 || axis > 4) return;
    XolAxis& a = f.axes[axis - 1];
    a.spacing = spacing;
    a.origin = origin;
    a.count = count;
    a.unit = unit;
    a.unitText = UnitText(unit);
}

void XolSetProjection(XolFile& f, const std::string& projection, double longitude, double latitude,
                      double orientation) {
    f.projection = Cut(projection, 1024);
    f.longitude = longitude;
    f.latitude = latitude;
    f.orientation = orientation;
    xolSetGeoInfoUTMProj(f.header, f.projection, longitude, latitude, orientation);
}

void XolSetDataType(XolFile& f, int32_t value) {
    f.dataType = value;
    xolSetDataType(f.header, value);
}

void XolSetMisc(XolFile& f, int index, float value) {
    if (index >= 1 && index <= 7) f.misc[index - 1] = value;
}

void XolCreateFile(XolFile& f, const std::string& path, int* status) {
    f.path = path;
    if (xolAddCustomBlock(f.header, 1, "TRN_Misc", 7, f.misc) != 0)
        return Fail(f, kXolNoCustomBlock, status, LibraryReason());
    std::string why;
    for (int n = 1; n <= f.noDynamicItems; ++n) {
        const int code =
            DefineItem(f, xolItemD(f.header, n), f.dynamicItems[static_cast<size_t>(n - 1)], why);
        if (code != 0) return Fail(f, code, status, why, XolErrorText(code) + " for " + path);
    }
    if (xolFileCreate(path, f.header, &f.file) != 0)
        return Fail(f, kXolCreateFile, status, LibraryReason(),
                    XolErrorText(kXolCreateFile) + " for " + path);
    f.position = 0;
    f.mode = 2;
    Succeed(status);
}

void XolWriteStatic(XolFile& f, const float* values, int32_t type, const std::string& name,
                    int32_t unit, int* status) {
    if (f.position >= 1) return Fail(f, kXolStaticWriteAfterDynamic, status, "");
    const XolHandle st = xolStaticCreate(f.header);
    const XolItem item = MakeItem(type, name, unit);
    f.staticItems.push_back(item);
    f.noStaticItems = static_cast<int32_t>(f.staticItems.size());
    std::string why;
    if (int code = DefineItem(f, xolItemS(st), item, why)) return Fail(f, code, status, why);
    const int written = xolStaticWrite(f.file, st, values);
    xolStaticDestroy(st);
    if (written != 0) return Fail(f, kXolStaticWrite, status, LibraryReason());
    Succeed(status);
}

void XolWriteDynamic(XolFile& f, const float* values, int* status) {
    if (f.position == 0) f.position = 1;
    if (xolWriteItemTimeStep(f.header, f.file, 0.0, values) != 0)
        return Fail(f, kXolDynamicWrite, status, LibraryReason());
    ++f.position;
    Succeed(status);
}

// ---- the summary in the log -------------------------------------------------

void XolPrintSummary(const XolFile& f) {
    auto number = [](double v) { return FormatNumber(v, 10); };
    auto column = [](long v, int width) {
        char text[32];
        std::snprintf(text, sizeof text, "%*ld", width, v);
        return std::string(text);
    };
    WriteLine(std::string(27, '-') + " Data File Summary " + std::string(27, '-'));
    WriteLine("  Data origin: " + f.appTitle);
    WriteLine("  Title  : " + std::string(TrimRight(f.title)));
    WriteLine(Filled("  Delete : %", f.deleteValue));
    WriteLine("  Axis  Sets   Interval  Axis origin  Unit");
    if (f.noTimeSteps > 1) {
        std::string row = "  time" + column(f.noTimeSteps, 6) + " " + number(f.timeStep);
        if (f.timeAxisType == kXolTimeCalendar)
            row += " " + std::string(Trim(f.startDateTime));
        else
            row += " " + number(f.startOffset) + " " + f.timeUnitText;
        WriteLine(row);
    }
    for (int d = 0; d < f.dimension && d < 4; ++d) {
        const XolAxis& a = f.axes[d];
        WriteLine(column(d + 1, 6) + column(a.count, 6) + " " + number(a.spacing) + "   " +
                  number(a.origin) + "  " + " " + a.unitText);
    }
    WriteLine("Item name             Item type               Minimum    Maximum Missing Unit");
    for (const XolItem& item : f.dynamicItems) {
        std::string name = Cut(item.name, 20);
        name.resize(20, ' ');
        std::string type = Cut(item.typeText, 20);
        type.resize(20, ' ');
        WriteLine("  " + name + " " + type + " " + number(item.minimum) + " " +
                  number(item.maximum) +
                  column(item.missing == kUnsetInteger ? 0 : item.missing, 8) + " " +
                  (item.type == 999 ? std::string() : UnitText(item.baseUnit)));
    }
    WriteLine(std::string(70, '-'));
}

// ---- values that are no numbers ------------------------------------------------

void XolCheckFinite(const XolFile& f, const float* values) {
    const size_t n = XolItemValues(f);
    size_t i = 0;
    while (i < n && std::isfinite(values[i])) ++i;
    if (i == n) return;
    // The item just read is the one before the reading position.
    const int32_t read = std::max(f.position - 2, 0);
    const int32_t items = std::max(f.noDynamicItems, 1);
    const int32_t item = read % items + 1, step = read / items;
    std::string text =
        "XOL data holds a value that is not a finite number: " + std::string(Trim(f.path)) +
        ", item " + std::to_string(item);
    if (item <= static_cast<int32_t>(f.dynamicItems.size()))
        text += " \"" + f.dynamicItems[static_cast<size_t>(item - 1)].name + "\"";
    if (f.noTimeSteps > 1) text += ", step " + std::to_string(step);
    if (f.dimension == 1) text += ", point " + std::to_string(i);
    if (f.dimension >= 2) {
        std::string place;
        size_t rest = i;
        for (int d = 0; d < f.dimension && d < 4; ++d) {
            const size_t count = static_cast<size_t>(std::max(f.axes[d].count, 1));
            place += (d > 0 ? "," : "") + std::to_string(rest % count);
            rest /= count;
        }
        text += ", point (" + place + ")";
    }
    StopRun(text);
}

void XolCheckFiniteSteps(const std::string& path, int32_t items, int32_t first, int32_t last) {
    XolFile f = XolOpenRead(path);
    std::vector<float> values(XolItemValues(f));
    last = std::min(last, f.noTimeSteps - 1);
    first = std::max(first, 0);
    for (int64_t m = 0; m < static_cast<int64_t>(first) * f.noDynamicItems; ++m) XolSkipDynamic(f);
    for (int32_t s = first; s <= last; ++s) {
        for (int32_t n = 1; n <= f.noDynamicItems; ++n) {
            if (n > items) {
                XolSkipDynamic(f);
                continue;
            }
            XolReadDynamic(f, values.data());
            XolCheckFinite(f, values.data());
        }
    }
    XolClose(f);
}

// ---- maps on the model's grid --------------------------------------------------

namespace {

// The file and what differs follow the fixed text, so that the user sees
// which map is off and by how much.
void CheckAxis(const XolFile& f, int axis, float spacing, int32_t last) {
    const bool x = axis == 1;
    const XolAxis& a = f.axes[axis - 1];
    if (a.spacing != spacing)
        XolStopOnContent(x ? "XOL data does not have the correct grid spacing (x-dir.)"
                           : "XOL data does not have the correct grid spacing (y-dir.)",
                         f, XolSpacingFound(a.spacing, spacing));
    if (a.count != last + 1)
        XolStopOnContent(
            x ? "XOL data does not have the correct number of grid points (x.dir.)"
              : "XOL data does not have the correct number of grid points (y.dir.)",
            f, std::to_string(a.count) + " points where the grid has " + std::to_string(last + 1));
}

// Reads items 1 to item, so that the selected one stays in values, and checks it.
void ReadItems(XolFile& f, int32_t item, float* values) {
    XolCheckItemNumber(f, item);
    for (int32_t n = 1; n <= item; ++n) XolReadDynamic(f, values);
    XolCheckFinite(f, values);
    XolNoteItemRange(f, item, values);
    XolClose(f);
}

// The stop of a map with another number of spatial axes than the reader wants.
void CheckDimension(const XolFile& f, int wanted, const char* text, const char* kind) {
    if (f.dimension == wanted) return;
    StopRun(std::string(text) + ": " + std::string(Trim(f.path)) + ": it has " +
            std::to_string(f.dimension) + " spatial axes where " + kind + " has " +
            std::to_string(wanted));
}

}  // namespace

// The summary of a map follows its reading, so that it gives the range of
// the item read; a map that does not fit stops before with its file named.
void ReadGridFile1D(const std::string& path, int32_t item, float* values, const GridShape& grid) {
    XolFile f = XolOpenRead(path);
    CheckDimension(f, 1, "XOL data is not 1D", "a map of the 1DH model");
    CheckAxis(f, 1, grid.dx, grid.J);
    ReadItems(f, item, values);
    XolPrintSummary(f);
}

void ReadGridFile2D(const std::string& path, int32_t item, float* values, const GridShape& grid) {
    XolFile f = XolOpenRead(path);
    CheckDimension(f, 2, "ERR_XOL_NOT2D", "a map");
    CheckAxis(f, 1, grid.dx, grid.J);
    CheckAxis(f, 2, grid.dy, grid.K);
    ReadItems(f, item, values);
    XolPrintSummary(f);
}

void XolNoteItemRange(XolFile& f, int32_t item, const float* values) {
    if (item < 1 || item > static_cast<int32_t>(f.dynamicItems.size())) return;
    XolItem& it = f.dynamicItems[static_cast<size_t>(item - 1)];
    const size_t n = XolItemValues(f);
    double low = 0.0, high = 0.0;
    int32_t missing = 0;
    bool any = false;
    for (size_t i = 0; i < n; ++i) {
        const float v = values[i];
        if (v == f.deleteValue) {
            ++missing;
            continue;
        }
        low = any ? std::min(low, static_cast<double>(v)) : v;
        high = any ? std::max(high, static_cast<double>(v)) : v;
        any = true;
    }
    if (any) it.minimum = low, it.maximum = high;
    it.missing = missing;
}

std::string MapValueAt(const std::string& path, float value, size_t index, int32_t J) {
    const size_t stride = static_cast<size_t>(J) + 1;
    char text[96];
    std::snprintf(text, sizeof text, "%.7g at point (%zu,%zu)", static_cast<double>(value),
                  index % stride, index / stride);
    return ": " + path + ": " + text;
}

void XolStopOnContent(const std::string& text, const XolFile& file, const std::string& detail) {
    StopRun(text + ": " + file.path + (detail.empty() ? "" : ": " + detail));
}

std::string XolAxesFound(const XolFile& file) {
    return "it has " + std::to_string(file.dimension) +
           (file.dimension == 1 ? " spatial axis" : " spatial axes");
}

std::string XolItemsFound(const XolFile& file, const std::string& wanted) {
    return "it holds " + std::to_string(file.noDynamicItems) +
           (file.noDynamicItems == 1 ? " item" : " items") + " where " + wanted + " " +
           (wanted == "1" ? "is" : "are") + " needed";
}

std::string XolSpacingFound(float found, float grid) {
    char text[96];
    std::snprintf(text, sizeof text, "spacing %.7g where the grid has %.7g",
                  static_cast<double>(found), static_cast<double>(grid));
    return text;
}

void XolCheckItemNumber(const XolFile& file, int32_t item) {
    if (item >= 1 && item <= file.noDynamicItems) return;
    XolStopOnContent("Item_Numbers = " + std::to_string(item) + " selects no item", file,
                     "it holds " + std::to_string(file.noDynamicItems) +
                         (file.noDynamicItems == 1 ? " item" : " items") + ", numbered from 1");
}
