#include "output/deterministic.hpp"

#include <algorithm>
#include <cmath>
#include <new>

#include "data/geoframe.hpp"
#include "input/kvt_access.hpp"
#include "output/output_lock.hpp"
#include "processes/rollers.hpp"
#include "run/datetime.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

DeterministicOutput gOutputDet;

// The surface above the datum of the bed levels, a level surface. Bed levels
// ("Still water depth", negative in water) have no standard name of that sign.
constexpr const char* kSurfaceHeight = "sea_surface_height_above_geopotential_datum";

const OutputItemInfo kDeterministicItems[12] = {
    {"Surface elevation", 100078, 1000, kSurfaceHeight},
    {"Water depth", 100280, 1000, "sea_floor_depth_below_sea_surface"},
    {"P flux", 100080, 4700},
    {"Q flux", 100080, 4700},
    {"Roller thickness", 100299, 1000},
    {"Roller angle", 999, 1000},
    {"Roller celerity, cx", 100016, 2000},
    {"Roller celerity, cy", 100016, 2000},
    {"Still water depth", 100280, 1000},
    {"Water level (roller)", 100000, 1000},
    {"U velerity", 100016, 2000, "sea_water_x_velocity"},
    {"V velerity", 100016, 2000, "sea_water_y_velocity"}};

namespace {

constexpr const char* kWrongItem = "WriteOutputStatistic: Wrong type of item";

// A roller field, or 0 where the run has no rollers.
float Roller(const std::vector<float>& field, size_t at) {
    return field.empty() ? 0.0f : field[at];
}

// The value of item at grid point (j,k), the delete value where it has none.
float ItemValue(int32_t item, int32_t j, int32_t k) {
    const GridState& g = gGrid;
    const RollerSettings& ro = gRollers;
    const size_t at = g.At(j, k);
    const bool dry = g.bed[at] - g.xi[at] >= 0.0f;
    switch (item) {
        case 1:
            return dry ? kDeleteValue : g.xi[at];
        case 2:
            return dry ? kDeleteValue : g.xi[at] - g.bed[at];
        case 3:
            return dry ? kDeleteValue : g.P[at];
        case 4:
            return dry ? kDeleteValue : g.Q[at];
        case 5:
            return dry ? kDeleteValue : Roller(ro.delta, at);
        case 6:
            return dry ? kDeleteValue
                       : static_cast<float>(std::atan(Roller(ro.tanPhi, at)) / 0.017453292f);
        case 7:
            return dry ? kDeleteValue : Roller(ro.cx, at);
        case 8:
            return dry ? kDeleteValue : Roller(ro.cy, at);
        case 9:
            return g.bed[at] >= g.landValue ? kDeleteValue : g.bed[at];
        case 10:
            return Roller(ro.delta, at) > 1e-10f ? g.xi[at] - g.bed[at] : kDeleteValue;
        case 11: {
            if (g.bed[at] >= 0.0f) return kDeleteValue;
            const double west = j > 0 ? g.P[at - 1] : g.PWest[k];
            return static_cast<float>((static_cast<double>(g.P[at]) + west) * 0.5 / g.depth[at]);
        }
        case 12: {
            if (g.bed[at] >= 0.0f) return kDeleteValue;
            if (k == 0)
                return static_cast<float>((static_cast<double>(g.Q[at]) + g.QSouth[j]) * 0.5 /
                                          g.depth[at]);
            const size_t south = at - g.Stride();
            const double sum =
                static_cast<double>(g.Q[at]) + g.Q[south] + g.QPrev[at] + g.QPrev[south];
            return static_cast<float>(sum * 0.25 / g.depth[at]);
        }
        default:
            StopRun(kWrongItem);
    }
}

// The data-type flag: 1 marks hot transfer data (depth, P, Q), -1 a file of
// one depth or roller level.
int32_t DeterministicDataType(const OutputRecord2D& r) {
    const std::vector<int32_t>& n = r.itemNumbers;
    if (n.size() == 3 && n[0] == 2 && n[1] == 3 && n[2] == 4) return 1;
    if (n.size() == 1 && (n[0] == 2 || n[0] == 10)) return -1;
    return 0;
}

bool Due(const OutputRecord2D& r, int32_t step) {
    return step >= r.firstStep && step <= r.lastStep && (step - r.firstStep) % r.stepInterval == 0;
}

void WriteRecord(OutputRecord2D& r) {
    const int32_t points = RecordPoints(r);
    for (int32_t p = 0; p < points; ++p) {
        const OutputSubGrid s = RecordSubGrid(r, p);
        for (int32_t item : r.itemNumbers) {
            float* v = r.values.data();
            for (int32_t b = 0; b < s.ny; ++b) {
                const int32_t k = s.k0 + b * s.dk;
                for (int32_t a = 0; a < s.nx; ++a) *v++ = ItemValue(item, s.j0 + a * s.dj, k);
            }
            XolWriteDynamic(r.file, r.values.data());
        }
    }
    XolFlush(r.file);
}

// A list of count values. The count comes from a key of its own (countKey,
// or a fixed 3 for a range): a list that holds fewer values than the count
// asks for is refused before room for the count is taken, a check the reader
// adds so that a mistyped count cannot claim the machine's memory or leave
// points at a default nobody gave.
void ReadRange(KvtHandle section, const char* key, int32_t count, const std::string& asker,
               int32_t number, std::vector<int32_t>& range) {
    const int given = KvtParamCount(section, key);
    if (given < count && (given > 0 || count > 1))
        StopRun("SetupOutputDeterministic2D: " + std::string(key) + " of record " +
                std::to_string(number) + " holds " + std::to_string(given) + " values, but " +
                asker + " asks for " + std::to_string(count));
    range.assign(static_cast<size_t>(count), 0);
    KvtGetIntegerList(section, key, range.data(), count);
}

}  // namespace

int32_t OutputTypeFromExtension(const std::string& fileName) {
    const size_t dot = fileName.rfind('.');
    if (dot == std::string::npos) return -1;
    const std::string ext = fileName.substr(dot + 1, 4);
    if (ext == "xol0" || ext == "dt0") return 0;
    if (ext == "xol1" || ext == "dt1") return 1;
    if (ext == "xol2" || ext == "dt2") return 2;
    return -1;
}

int32_t RecordPoints(const OutputRecord2D& r) {
    return r.type <= 0 ? r.noOfPoints : 1;
}

OutputSubGrid RecordSubGrid(const OutputRecord2D& r, int32_t point) {
    OutputSubGrid s;
    if (r.type <= 0) {
        s.j0 = r.xRange[point];
        s.k0 = r.yRange[point];
        return s;
    }
    s.j0 = r.xRange[0], s.dj = r.xRange[2], s.nx = (r.xRange[1] - r.xRange[0]) / r.xRange[2] + 1;
    s.k0 = r.yRange[0], s.dk = r.yRange[2], s.ny = (r.yRange[1] - r.yRange[0]) / r.yRange[2] + 1;
    return s;
}

void ReadOutputSpec(KvtHandle parent, int32_t number, const OutputSpecKeys& keys,
                    OutputRecord2D& r) {
    const KvtHandle section = KvtOpenSection(parent, Filled("Output_Spec_Data_%", number));
    const GridState& g = gGrid;
    r.fileName = KvtTrimmedFilename(section, "File_Name", 256);
    const int32_t fromExtension = OutputTypeFromExtension(r.fileName);
    if (fromExtension < 0) StopRun("SetupOutputDeterministic2D: Wrong file extension");
    r.type = fromExtension;
    auto atLeastOne = [&](int32_t value, const char* key) {
        if (value < 1)
            StopRun(Filled(std::string("SetupOutputDeterministic2D: ") + key +
                               " of record % must be at least 1",
                           number));
    };
    KvtGetInteger(section, "type", r.type);
    if (r.type <= 0) {
        r.noOfPoints = 1;
        KvtGetInteger(section, "NO_OF_POINTS", r.noOfPoints);
        atLeastOne(r.noOfPoints, "NO_OF_POINTS");
        const std::string points = "NO_OF_POINTS = " + std::to_string(r.noOfPoints);
        ReadRange(section, "X_Range_And_Interval", r.noOfPoints, points, number, r.xRange);
        ReadRange(section, "Y_Range_And_Interval", r.noOfPoints, points, number, r.yRange);
        for (int32_t p = 0; p < r.noOfPoints; ++p)
            if (r.xRange[p] < 0 || r.xRange[p] > g.J || r.yRange[p] < 0 || r.yRange[p] > g.K)
                StopRun(
                    Filled(Filled("SetupOutputDeterministic2D: point % of record % lies outside "
                                  "the grid",
                                  p + 1),
                           number));
        r.dimension = 0;
    } else {
        r.noOfPoints = 1;
        const std::string line = "a line or area record";
        ReadRange(section, "X_Range_And_Interval", 3, line, number, r.xRange);
        ReadRange(section, "Y_Range_And_Interval", 3, line, number, r.yRange);
        auto check = [&](const std::vector<int32_t>& range, int32_t top, const char* key) {
            if (range[0] < 0 || range[1] > top || range[0] > range[1] || range[2] < 1)
                StopRun(Filled(Filled(std::string("SetupOutputDeterministic2D: ") + key +
                                          " of record % must run from first to last within 0..% "
                                          "with an interval of at least 1",
                                      number),
                               top));
        };
        check(r.xRange, g.J, "X_Range_And_Interval");
        check(r.yRange, g.K, "Y_Range_And_Interval");
        const bool xLine = r.xRange[0] != r.xRange[1], yLine = r.yRange[0] != r.yRange[1];
        r.dimension = xLine && yLine ? 2 : (xLine || yLine ? 1 : 0);
    }
    if (keys.timeSpan) {
        KvtGetInteger(section, "First_Time_step", r.firstStep);
        KvtGetInteger(section, "Last_Time_step", r.lastStep);
        KvtGetInteger(section, "Time_Step_Interval", r.stepInterval);
        atLeastOne(r.stepInterval, "Time_Step_Interval");
    }
    r.numberOfItems = 1;
    KvtGetInteger(section, "Number_Of_Items", r.numberOfItems);
    atLeastOne(r.numberOfItems, "Number_Of_Items");
    const std::string items = "Number_Of_Items = " + std::to_string(r.numberOfItems);
    ReadRange(section, "Item_Numbers", r.numberOfItems, items, number, r.itemNumbers);
    for (int32_t item : r.itemNumbers)
        if (item < 1 || item > keys.maxItem) StopRun(kWrongItem);
    r.title = KvtTrimmedString(section, "Title", 40);
    if (keys.typeOfLand) KvtGetInteger(section, "Type_Of_Land", r.typeOfLand);
}

void SetupOutputDeterministic2D(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Output_Deterministic_2D");
    gOutputDet = DeterministicOutput{};
    int32_t number = 0;
    KvtGetInteger(section, "Number_Of_Records", number);
    gOutputDet.numberOfRecords = std::max(number, 0);
    // Record by record as their sections are found: a count beyond the
    // sections stops at the first one missing, before room for it is taken.
    for (int32_t n = 1; n <= gOutputDet.numberOfRecords; ++n)
        ReadOutputSpec(section, n, OutputSpecKeys{}, gOutputDet.records.emplace_back());
}

void SetStepTimeAxis(XolFile& file, int32_t startStep, int32_t stepInterval) {
    const GridState& g = gGrid;
    // The text holds whole seconds; a start between them goes into the offset.
    const DateTime start = AddSeconds(g.start, startStep * g.dt);
    const double fraction = start.seconds - std::floor(start.seconds);
    XolSetCalendarAxis(file, stepInterval * g.dt, DateTimeText(start), 1400, fraction);
}

// Where the point of an item of a point file lies: grid index, metres on the
// grid and, for a grid on a map projection, projected and geographic position.
void SetPointPosition(XolFile& file, int32_t item, const OutputSubGrid& at) {
    const GridState& g = gGrid;
    const double x = at.j0 * static_cast<double>(g.dx), y = at.k0 * static_cast<double>(g.dy);
    XolSetItemAttribute(file, item, {"grid_index", "", {double(at.j0), double(at.k0)}});
    XolSetItemAttribute(file, item, {"position", "", {x, y}});
    if (g.frame == 0 || GeoIsNone(g.projection)) return;
    double east = 0.0, north = 0.0, lon = 0.0, lat = 0.0;
    GeoFrameXy2Proj(g.frame, x, y, east, north);
    GeoFrameXy2Geo(g.frame, x, y, lon, lat);
    XolSetItemAttribute(file, item, {"projected_position", "", {east, north}});
    XolSetItemAttribute(file, item, {"geographic_position", "", {lon, lat}});
}

GridPlace SetGridProjection(XolFile& file, double x, double y) {
    const GridState& g = gGrid;
    GridPlace place;
    std::string projection;
    GeoFrameXy2Geo(g.frame, x, y, place.longitude, place.latitude);
    GeoFrameGetTrueNorth(g.frame, x, y, place.north);
    place.north += 0.0;  // no negative zero in the file
    GeoFrameGetProjectionString(g.frame, projection);
    XolSetProjection(file, projection, place.longitude, place.latitude, place.north);
    return place;
}

void CreateOutputRecordFile(OutputRecord2D& r, const OutputItemInfo* table, int32_t startStep,
                            int32_t stepInterval, int32_t dataType) {
    const GridState& g = gGrid;
    const int32_t points = RecordPoints(r);
    const int32_t items = r.numberOfItems * points;
    r.file = XolCreateHeader(r.title, items, r.dimension);
    XolSetDataType(r.file, dataType);

    const OutputSubGrid s = RecordSubGrid(r, 0);
    int axis = 1;
    if (r.type > 0 && s.nx > 1)
        XolSetAxis(r.file, axis++, g.dx * s.dj, static_cast<float>(s.j0) * g.dx, s.nx, 1000);
    if (r.type > 0 && s.ny > 1)
        XolSetAxis(r.file, axis++, g.dy * s.dk, static_cast<float>(s.k0) * g.dy, s.ny, 1000);

    int32_t n = 1;
    for (int32_t p = 0; p < points; ++p) {
        for (int32_t item : r.itemNumbers) {
            const OutputItemInfo& info = table[item - 1];
            std::string name = info.name;
            if (points > 1) {
                const OutputSubGrid q = RecordSubGrid(r, p);
                // The filling trims the blank behind the colon; it is put back.
                name = Filled("P(%,", q.j0) + Filled("%):", q.k0) + " " + name;
            }
            XolSetItem(r.file, n, info.type, name, info.unit);
            if (info.standardName != nullptr)
                XolSetItemAttribute(r.file, n, {"standard_name", info.standardName, {}});
            if (r.dimension == 0) SetPointPosition(r.file, n, RecordSubGrid(r, p));
            ++n;
        }
    }
    SetStepTimeAxis(r.file, startStep, stepInterval);
    XolSetMisc(r.file, 4, g.landValue);
    if (r.dimension == 2) {
        SetGridProjection(r.file, s.j0 * static_cast<double>(g.dx),
                          s.k0 * static_cast<double>(g.dy));
    } else {
        XolSetMisc(r.file, 1, 0.0f);
    }
    XolCreateFile(r.file, r.fileName);

    try {
        r.values.assign(s.Size(), 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    if (r.dimension == 2) {
        float* v = r.values.data();
        for (int32_t b = 0; b < s.ny; ++b)
            for (int32_t a = 0; a < s.nx; ++a) {
                const float bed = g.bed[g.At(s.j0 + a * s.dj, s.k0 + b * s.dk)];
                *v++ = r.typeOfLand == 1 && !(bed < g.landValue) ? kDeleteValue : bed;
            }
        XolWriteStatic(r.file, r.values.data(), 100079, "Bathymetry", 1000);
    }
}

void CreateOutputDeterministic() {
    for (OutputRecord2D& r : gOutputDet.records) {
        LockOutputFile("CreateOutputDeterministic", r.fileName);
        CreateOutputRecordFile(r, kDeterministicItems, r.firstStep, r.stepInterval,
                               DeterministicDataType(r));
        if (r.firstStep == 0) WriteRecord(r);
    }
}

void WriteOutputDeterministic(int32_t step) {
    for (OutputRecord2D& r : gOutputDet.records)
        if (Due(r, step)) WriteRecord(r);
}

void CloseOutputDeterministic() {
    for (OutputRecord2D& r : gOutputDet.records) {
        if (r.file.mode != 2 || r.file.file == 0) continue;
        XolFlush(r.file);
        XolClose(r.file);
        UnlockOutputFile(r.fileName);
        XolPrintSummary(r.file);
    }
}
