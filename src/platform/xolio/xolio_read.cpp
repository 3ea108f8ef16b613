// Reading data files: the header, the items and their axes from the
// variables of a NetCDF file, whether this library wrote it or another tool
// did (docs/data-files.md says what is taken for what is left out), then the
// values item by item and step by step.
//
// What a file says is weighed before it is used, and a file that cannot be
// used is refused at open with the reason: counts beyond the 32-bit range,
// axes without points, with a spacing of 0, falling or not equidistant,
// origins, spacings and coordinates that are no finite numbers, the time axis
// anywhere but first. Nothing here is sized by the file: coordinates are
// weighed in pieces and values go straight into the caller's buffer.
#include <netcdf.h>

#include <algorithm>
#include <cfloat>
#include <climits>
#include <cmath>
#include <cstring>
#include <new>
#include <stdexcept>
#include <type_traits>
#include <vector>

#include "platform/geo/geo.hpp"
#include "platform/qty/qty.hpp"
#include "platform/xolio/xolio_record.hpp"

namespace {

// Texts of attributes longer than this are taken as missing.
constexpr size_t kMaxText = size_t{1} << 20;
// Coordinates are weighed in pieces of this many values.
constexpr size_t kPiece = size_t{1} << 16;
// The most values an item may have: its bytes must be countable in 64 bits.
constexpr double kMaxValues = 2305843009213693952.0;  // 2^61

bool Numeric(nc_type type) {
    return type >= NC_BYTE && type <= NC_UINT64 && type != NC_CHAR;
}

std::string GetText(int ncid, int var, const char* name, const std::string& fallback = "") {
    nc_type type = NC_NAT;
    size_t length = 0;
    if (nc_inq_att(ncid, var, name, &type, &length) != NC_NOERR || type != NC_CHAR ||
        length > kMaxText)
        return fallback;
    std::string text(length, '\0');
    if (length > 0 && nc_get_att_text(ncid, var, name, text.data()) != NC_NOERR) return fallback;
    while (!text.empty() && text.back() == '\0') text.pop_back();
    return text;
}

// The first value of a numeric attribute; false when there is none or, for
// an integer, when it is out of the integer's range.
template <typename T>
bool GetNumber(int ncid, int var, const char* name, T& value) {
    nc_type type = NC_NAT;
    size_t length = 0;
    double v[16];
    if (nc_inq_att(ncid, var, name, &type, &length) != NC_NOERR || !Numeric(type) || length < 1 ||
        length > std::size(v) || nc_get_att_double(ncid, var, name, v) != NC_NOERR)
        return false;
    if constexpr (std::is_integral_v<T>) {
        if (!(v[0] >= INT_MIN && v[0] <= INT_MAX)) return false;
    }
    value = static_cast<T>(v[0]);
    return true;
}

// The coordinate variable of a dimension: the numeric variable of its name
// over that dimension alone; -1 when there is none.
int Coordinate(int ncid, const char* name, int dim) {
    int var = -1, ndims = 0, only = -1;
    nc_type type = NC_NAT;
    if (nc_inq_varid(ncid, name, &var) != NC_NOERR ||
        nc_inq_varndims(ncid, var, &ndims) != NC_NOERR || ndims != 1 ||
        nc_inq_vardimid(ncid, var, &only) != NC_NOERR || only != dim ||
        nc_inq_vartype(ncid, var, &type) != NC_NOERR || !Numeric(type))
        return -1;
    return var;
}

// The values of a coordinate weighed piece by piece: all finite, each within
// a tolerance of first + i * step. The tolerance takes up the rounding of
// 32-bit coordinates far from their origin. Returns 0 or the failure.
int WeighCoordinate(int ncid, int var, size_t length, const std::string& what, double& first,
                    double& step) {
    nc_type type = NC_NAT;
    nc_inq_vartype(ncid, var, &type);
    const double epsilon = type == NC_FLOAT ? FLT_EPSILON : type == NC_DOUBLE ? DBL_EPSILON : 0.0;
    std::vector<double> piece(std::min(length, kPiece));
    first = 0.0;
    step = 0.0;
    for (size_t start = 0; start < length; start += piece.size()) {
        const size_t count = std::min(piece.size(), length - start);
        const int status = nc_get_vara_double(ncid, var, &start, &count, piece.data());
        if (status != NC_NOERR) return XolNcFail(kXolErrFormat, status, what + " can't be read");
        if (start == 0) {
            first = piece[0];
            step = length > 1 ? piece[1] - piece[0] : 0.0;
        }
        for (size_t i = 0; i < count; ++i) {
            const double v = piece[i];
            if (!std::isfinite(v))
                return XolFail(kXolErrFormat, what + " holds a value that is not a finite number");
            const double expected = first + static_cast<double>(start + i) * step;
            const double tolerance =
                1e-4 * std::fabs(step) + 4.0 * epsilon * std::max(std::fabs(v), std::fabs(first));
            if (std::fabs(v - expected) > tolerance)
                return XolFail(kXolErrFormat, what + " is not equidistant");
        }
    }
    if (!std::isfinite(step)) return XolFail(kXolErrFormat, what + " is not equidistant");
    return 0;
}

std::string Number(double v) {
    char text[32];
    std::snprintf(text, sizeof text, "%.9g", v);
    return text;
}

// The axes of a variable's spatial dimensions, from the coordinate variables
// where there are some: origin and spacing, which must be usable.
int ReadAxes(int ncid, int var, int timeDim, XolItemRec& item) {
    int ndims = 0;
    nc_inq_varndims(ncid, var, &ndims);
    std::vector<int> dims(static_cast<size_t>(std::max(ndims, 0)));
    if (ndims > 0) nc_inq_vardimid(ncid, var, dims.data());
    const bool timeFirst = ndims > 0 && dims[0] == timeDim;
    for (int k = 1; k < ndims; ++k)
        if (dims[static_cast<size_t>(k)] == timeDim)
            return XolFail(kXolErrFormat,
                           "item " + item.name + " has the time axis in another place than first");
    const int first = timeFirst ? 1 : 0;
    item.dims = ndims - first;
    if (item.dims > 4)
        return XolFail(kXolErrFormat, "item " + item.name + " has " + std::to_string(item.dims) +
                                          " spatial axes, more than four");
    static const int kTypes[] = {kXolAxisNone, kXolAxisEq1, kXolAxisEq2, kXolAxisEq3, kXolAxisEq4};
    item.axisType = kTypes[item.dims];
    double values = 1.0;
    for (int d = 0; d < item.dims; ++d) {
        const int dim = dims[static_cast<size_t>(ndims - 1 - d)];  // the last varies fastest
        char name[NC_MAX_NAME + 1] = {};
        size_t length = 0;
        nc_inq_dim(ncid, dim, name, &length);
        const std::string axis = std::string("axis ") + name;
        if (length == 0) return XolFail(kXolErrFormat, axis + " has no points");
        if (length > static_cast<size_t>(INT_MAX))
            return XolFail(kXolErrFormat, axis + " has " + std::to_string(length) +
                                              " points, more than a data file may hold");
        values *= static_cast<double>(length);
        item.count[d] = static_cast<int>(length);
        item.origin[d] = 0.0f;
        item.spacing[d] = 1.0f;
        const int coord = Coordinate(ncid, name, dim);
        if (coord < 0) continue;
        double first = 0.0, step = 0.0;
        if (int code = WeighCoordinate(ncid, coord, length, axis, first, step)) return code;
        item.first[d] = first;
        float origin = static_cast<float>(first);
        float spacing = length > 1 ? static_cast<float>(step) : 1.0f;
        GetNumber(ncid, coord, "origin", origin);
        GetNumber(ncid, coord, "spacing", spacing);
        if (!std::isfinite(origin))
            return XolFail(kXolErrFormat, axis + " has an origin that is not a finite number");
        if (!std::isfinite(spacing))
            return XolFail(kXolErrFormat, axis + " has a spacing that is not a finite number");
        if (spacing == 0.0f) return XolFail(kXolErrFormat, axis + " has spacing 0");
        if (spacing < 0.0f)
            return XolFail(kXolErrFormat,
                           axis + " falls (spacing " + Number(spacing) + "): its values must rise");
        item.origin[d] = origin;
        item.spacing[d] = spacing;
        if (!GetNumber(ncid, coord, "unit_code", item.axisUnit)) {
            const int unit = qtyUnitFromCf(GetText(ncid, coord, "units", "m"));
            item.axisUnit = unit > 0 ? unit : kUnitMetre;
        }
    }
    if (values > kMaxValues)
        return XolFail(kXolErrFormat, "item " + item.name + " has " + Number(values) +
                                          " values, more than a data file may hold");
    return 0;
}

int ReadTimeAxis(int ncid, XolHeaderRec& h, int& timeDim, int& timeVar) {
    timeDim = -1;
    timeVar = -1;
    nc_inq_unlimdim(ncid, &timeDim);
    if (timeDim < 0) nc_inq_dimid(ncid, "time", &timeDim);
    if (timeDim < 0) return 0;
    size_t steps = 0;
    nc_inq_dimlen(ncid, timeDim, &steps);
    if (steps > static_cast<size_t>(INT_MAX))
        return XolFail(kXolErrFormat, "the time axis has " + std::to_string(steps) +
                                          " steps, more than a data file may hold");
    h.steps = static_cast<int>(steps);
    char name[NC_MAX_NAME + 1] = {};
    nc_inq_dimname(ncid, timeDim, name);
    timeVar = Coordinate(ncid, name, timeDim);
    if (GetNumber(ncid, NC_GLOBAL, "time_axis_type", h.timeType)) {
        GetNumber(ncid, NC_GLOBAL, "time_unit", h.timeUnit);
        GetNumber(ncid, NC_GLOBAL, "time_start_offset", h.startOffset);
        GetNumber(ncid, NC_GLOBAL, "time_step", h.step);
        GetNumber(ncid, NC_GLOBAL, "time_start_index", h.startIndex);
        const std::string start = GetText(ncid, NC_GLOBAL, "time_start");
        if (start.size() >= 19) {
            h.date = start.substr(0, 10);
            h.time = start.substr(11, 8);
        }
    } else if (timeVar >= 0) {
        // A file made by another tool: the axis from the time coordinate.
        const std::string units = GetText(ncid, timeVar, "units", "s");
        const size_t since = units.find(" since ");
        h.timeType = since == std::string::npos ? kXolTimeRelative : kXolTimeCalendar;
        if (since != std::string::npos && units.size() >= since + 7 + 10) {
            h.date = units.substr(since + 7, 10);
            h.time = units.size() >= since + 7 + 19 ? units.substr(since + 18, 8) : "00:00:00";
        }
        const int unit = qtyUnitFromCf(since == std::string::npos ? units : units.substr(0, since));
        h.timeUnit = unit > 0 ? unit : kUnitSecond;
        double first = 0.0, step = 0.0;
        if (int code = WeighCoordinate(ncid, timeVar, steps, "the time axis", first, step))
            return code;
        h.startOffset = first;
        h.step = steps > 1 ? step : 1.0;
    }
    if (!std::isfinite(h.step) || !std::isfinite(h.startOffset))
        return XolFail(kXolErrFormat,
                       "the time axis has a start or step that is not a finite number");
    return 0;
}

// The header's custom blocks: custom_block_count of them, each no longer than the file.
int ReadBlocks(int ncid, uint64_t fileSize, XolHeaderRec& h) {
    int blocks = 0, attributes = 0;
    GetNumber(ncid, NC_GLOBAL, "custom_block_count", blocks);
    nc_inq_natts(ncid, &attributes);
    if (blocks < 0 || blocks > attributes)
        return XolFail(kXolErrFormat, "custom_block_count is " + std::to_string(blocks) +
                                          ", but the file holds " + std::to_string(attributes) +
                                          " attributes");
    for (int b = 1; b <= blocks; ++b) {
        const std::string key = "custom_block_" + std::to_string(b);
        nc_type type = NC_NAT;
        size_t length = 0;
        if (nc_inq_att(ncid, NC_GLOBAL, key.c_str(), &type, &length) != NC_NOERR) length = 0;
        if (length > fileSize)
            return XolFail(kXolErrFormat, key + " has " + std::to_string(length) +
                                              " values, more than the file holds");
        std::vector<float> values(length);
        if (length > 0 && Numeric(type))
            nc_get_att_float(ncid, NC_GLOBAL, key.c_str(), values.data());
        int dataType = 1;
        GetNumber(ncid, NC_GLOBAL, (key + "_data_type").c_str(), dataType);
        h.blocks.push_back(XolBlock{dataType, GetText(ncid, NC_GLOBAL, (key + "_name").c_str()),
                                    std::move(values), 0});
    }
    for (size_t b = 1; b < h.blocks.size(); ++b)
        h.blocks[b - 1].next = static_cast<XolHandle>(reinterpret_cast<uintptr_t>(&h.blocks[b]));
    return 0;
}

// A map made with another tool (GDAL, xarray) has no header of its place:
// the place of a file is that of its first point, so the longitude and
// latitude become those of the first point of its first map and the axes'
// origins are taken from there. With a grid mapping (crs_wkt, else
// spatial_ref) the CRS is its WKT, the coordinates lie on that map, and the
// orientation is that of a grid unturned on it; without one the map lies on
// no map ("NON-UTM") and the first point's coordinates stand for longitude
// and latitude. Series and lines stay without a place.
void PlaceForeignMap(int ncid, XolHeaderRec& h) {
    std::vector<XolItemRec*> maps;
    for (auto& item : h.items)
        if (item.dims >= 2) maps.push_back(&item);
    for (auto& item : h.statics)
        if (item->dims >= 2) maps.push_back(item.get());
    if (maps.empty()) return;
    const double east = maps[0]->first[0], north = maps[0]->first[1];
    h.geo = true;
    h.projection = "NON-UTM";
    h.longitude = east;
    h.latitude = north;
    int crs = -1;
    const std::string mapping = GetText(ncid, maps[0]->varid, "grid_mapping");
    std::string wkt;
    if (!mapping.empty() && nc_inq_varid(ncid, mapping.c_str(), &crs) == NC_NOERR) {
        wkt = GetText(ncid, crs, "crs_wkt");
        if (wkt.empty()) wkt = GetText(ncid, crs, "spatial_ref");
    }
    if (!wkt.empty()) {
        // A CRS known by a code is kept by it (a WKT is longer than a header's
        // projection may be).
        std::string code;
        const bool known = GeoShortName(wkt, code) == 0 &&
                           (code.rfind("UTM-", 0) == 0 || code.find(':') != std::string::npos);
        h.projection = known ? code : wkt;
        wkt = h.projection;
        h.longitude = h.latitude = 0.0;
        // A CRS the frame refuses (a geographic one) stays as the text, for
        // the reader of the file to refuse with its own message.
        double lon = 0.0, lat = 0.0;
        GeoHandle frame = 0;
        if (GeoProjectionOrigin(wkt, lon, lat) != 0 || GeoOpen(&frame, wkt, lon, lat, 0.0) != 0)
            return;
        const bool placed = GeoProj2Geo(frame, east, north, lon, lat) == 0 &&
                            GeoOrientationOnMap(wkt, lon, lat, 0.0, h.orientation) == 0;
        GeoClose(frame);
        if (!placed) return;
        h.longitude = lon;
        h.latitude = lat;
    }
    for (XolItemRec* item : maps) {
        item->origin[0] = static_cast<float>(item->first[0] - east);
        item->origin[1] = static_cast<float>(item->first[1] - north);
    }
}

// The header and the items of an open file.
int ReadHeader(int ncid, uint64_t fileSize, XolHeaderRec& h, int& timeDim, int& timeVar) {
    h.title = GetText(ncid, NC_GLOBAL, "title");
    h.appTitle = GetText(ncid, NC_GLOBAL, "application_title");
    GetNumber(ncid, NC_GLOBAL, "application_version", h.version);
    GetNumber(ncid, NC_GLOBAL, "file_type", h.fileType);
    GetNumber(ncid, NC_GLOBAL, "data_type", h.dataType);
    const bool deleteGiven = GetNumber(ncid, NC_GLOBAL, "delete_value", h.deleteValue);
    h.projection = GetText(ncid, NC_GLOBAL, "projection");
    h.geo = !h.projection.empty();
    GetNumber(ncid, NC_GLOBAL, "longitude", h.longitude);
    GetNumber(ncid, NC_GLOBAL, "latitude", h.latitude);
    GetNumber(ncid, NC_GLOBAL, "orientation", h.orientation);
    if (int code = ReadBlocks(ncid, fileSize, h)) return code;
    if (int code = ReadTimeAxis(ncid, h, timeDim, timeVar)) return code;
    if (timeDim < 0) h.steps = 1;

    // Items: every variable that is no coordinate and no grid mapping, in file order.
    int nvars = 0;
    nc_inq_nvars(ncid, &nvars);
    for (int var = 0; var < nvars; ++var) {
        char name[NC_MAX_NAME + 1] = {};
        int ndims = 0;
        nc_type type = NC_NAT;
        if (nc_inq_var(ncid, var, name, &type, &ndims, nullptr, nullptr) != NC_NOERR) continue;
        int dimid = -1;
        if (nc_inq_dimid(ncid, name, &dimid) == NC_NOERR) continue;  // a coordinate
        if (std::strcmp(name, "crs") == 0 || GetText(ncid, var, "grid_mapping_name") != "" ||
            GetText(ncid, var, "crs_wkt") != "" || GetText(ncid, var, "spatial_ref") != "")
            continue;
        // Auxiliary coordinates are no items.
        const std::string standard = GetText(ncid, var, "standard_name");
        if (standard == "projection_x_coordinate" || standard == "projection_y_coordinate" ||
            standard == "latitude" || standard == "longitude")
            continue;
        if (type != NC_FLOAT && type != NC_DOUBLE && type != NC_SHORT && type != NC_INT &&
            type != NC_BYTE)
            continue;
        XolItemRec item;
        item.varid = var;
        item.name = GetText(ncid, var, "long_name", name);
        if (!GetNumber(ncid, var, "item_type", item.type)) item.type = 999;
        if (!GetNumber(ncid, var, "item_unit", item.unit)) {
            const int unit = qtyUnitFromCf(GetText(ncid, var, "units", ""));
            item.unit = unit > 0 ? unit : 0;
        }
        if (!deleteGiven) GetNumber(ncid, var, "_FillValue", h.deleteValue);
        if (int code = ReadAxes(ncid, var, timeDim, item)) return code;
        int first = -1;
        if (ndims > 0) {
            std::vector<int> dims(static_cast<size_t>(ndims));
            nc_inq_vardimid(ncid, var, dims.data());
            first = dims[0];
        }
        // A file without time (a map made with another tool) is one step of dynamic items.
        if (first == timeDim || timeDim < 0)
            h.items.push_back(std::move(item));
        else
            h.statics.push_back(std::make_unique<XolItemRec>(std::move(item)));
    }
    // A header of this library names its projection, blank as it may be.
    int attribute = -1;
    if (nc_inq_attid(ncid, NC_GLOBAL, "projection", &attribute) != NC_NOERR)
        PlaceForeignMap(ncid, h);
    return 0;
}

}  // namespace

int xolFileRead(const std::string& path, XolHandle* header, XolHandle* file) {
    *header = 0;
    *file = 0;
    uint64_t fileSize = 0;
    if (int code = XolCheckFile(path, fileSize)) return code;
    int ncid = -1;
    const int status = nc_open(path.c_str(), NC_NOWRITE, &ncid);
    if (status != NC_NOERR) return XolNcFail(kXolErrOpen, status);
    auto h = std::make_unique<XolHeaderRec>();
    int timeDim = -1, timeVar = -1, code = 0;
    try {
        code = ReadHeader(ncid, fileSize, *h, timeDim, timeVar);
    } catch (const std::bad_alloc&) {
        code = XolFail(kXolErrRead, "not enough memory to read the header");
    } catch (const std::length_error&) {
        code = XolFail(kXolErrRead, "not enough memory to read the header");
    }
    if (code != 0) {
        nc_close(ncid);
        return code;
    }
    auto* f = new XolFileRec;
    f->ncid = ncid;
    f->header = h.get();
    f->path = path;
    f->timeVar = timeVar;
    f->timeless = timeDim < 0;
    for (auto& item : h->items) {
        item.source = f;
        XolRegister(&item);
    }
    for (auto& item : h->statics) {
        item->source = f;
        XolRegister(item.get());
    }
    *file = XolRegister(f);
    *header = XolRegister(h.release());
    return 0;
}

int xolFindBlockDynamic(XolHandle file) {
    XolFileRec* f = XolFileOf(file);
    if (f == nullptr) return XolFail(kXolErrArgument, "not a file");
    f->nextItem = 0;
    f->step = 0;
    return 0;
}

int xolFindBlockStatic(XolHandle file) {
    XolFileRec* f = XolFileOf(file);
    if (f == nullptr) return XolFail(kXolErrArgument, "not a file");
    f->staticCursor = 0;
    return 0;
}

XolHandle xolStaticRead(XolHandle file) {
    XolFileRec* f = XolFileOf(file);
    if (f == nullptr || f->staticCursor >= f->header->statics.size()) return 0;
    return static_cast<XolHandle>(
        reinterpret_cast<uintptr_t>(f->header->statics[f->staticCursor++].get()));
}

namespace {

// Reads the values of an item at a step (none for a static item or a file
// without time) into values, converted to the unit they pass in.
int ReadValues(const XolItemRec& item, bool timed, size_t step, float* values) {
    const XolFileRec* f = item.source;
    if (f == nullptr) return XolFail(kXolErrArgument, "item " + item.name + " has no open file");
    size_t start[5] = {step, 0, 0, 0, 0};
    size_t count[5] = {1, 1, 1, 1, 1};
    for (int d = 0; d < item.dims; ++d)
        count[1 + d] = static_cast<size_t>(item.count[item.dims - 1 - d]);
    const int skip = timed ? 0 : 1;  // no time index in front
    const int status = nc_get_vara_float(f->ncid, item.varid, start + skip, count + skip, values);
    if (status != NC_NOERR) return XolNcFail(kXolErrRead, status, "item " + item.name);
    XolConvert(item, values, item.Size(), false, f->header->deleteValue);
    return 0;
}

}  // namespace

int xolStaticGetData(XolHandle staticItem, float* values) {
    const XolItemRec* item = XolItemOf(staticItem);
    if (item == nullptr || item->source == nullptr)
        return XolFail(kXolErrArgument, "not a static item of an open file");
    return ReadValues(*item, false, 0, values);
}

namespace {

int NextItem(XolHeaderRec* h, XolFileRec* f, double* time, float* values) {
    if (h == nullptr || f == nullptr || f->header != h)
        return XolFail(kXolErrArgument, "not the header of an open file");
    if (h->items.empty()) return XolFail(kXolErrArgument, "the file holds no dynamic items");
    if (f->step >= static_cast<size_t>(h->steps))
        return XolFail(kXolErrEnd, "no more data: the file holds " + std::to_string(h->steps) +
                                       (h->steps == 1 ? " step of " : " steps of ") +
                                       std::to_string(h->items.size()) +
                                       (h->items.size() == 1 ? " item" : " items"));
    const XolItemRec& item = h->items[f->nextItem];
    if (values != nullptr)
        if (int code = ReadValues(item, !f->timeless, f->step, values)) return code;
    if (time != nullptr) time[0] = h->startOffset + static_cast<double>(f->step) * h->step;
    if (++f->nextItem == h->items.size()) {
        f->nextItem = 0;
        ++f->step;
    }
    return 0;
}

}  // namespace

int xolReadItemTimeStep(XolHandle header, XolHandle file, double* time, float* values) {
    return NextItem(XolHeaderOf(header), XolFileOf(file), time, values);
}

int xolSkipItem(XolHandle header, XolHandle file) {
    return NextItem(XolHeaderOf(header), XolFileOf(file), nullptr, nullptr);
}
