// Data files on disk: NetCDF in the classic 64-bit data format, written record
// by record and synchronised on every flush, so that a file a run is still
// writing can be read by another process and a file whose writer died stays
// readable up to its last flushed step.
#include <netcdf.h>
#include <sys/stat.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iterator>

#include "platform/geo/geo.hpp"
#include "platform/qty/qty.hpp"
#include "platform/xolio/xolio_record.hpp"

namespace {

const char* kAxisNames[] = {"x", "y", "z", "w"};
const char* kAxisLetters[] = {"X", "Y", "Z", ""};

int NcFail(int code, int status, const std::string& what) {
    return XolFail(code, what + ": " + nc_strerror(status));
}

std::string VariableName(const std::string& itemName, int index) {
    std::string name;
    for (char c : itemName) {
        const bool ok = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
        if (ok)
            name += c;
        else if (!name.empty() && name.back() != '_')
            name += '_';
    }
    while (!name.empty() && name.back() == '_') name.pop_back();
    if (name.empty() || (name[0] >= '0' && name[0] <= '9')) name = "item_" + name;
    return name + (index > 0 ? "_" + std::to_string(index) : "");
}

void PutText(int ncid, int var, const char* name, const std::string& text) {
    nc_put_att_text(ncid, var, name, text.size(), text.c_str());
}

std::string GetText(int ncid, int var, const char* name, const std::string& fallback = "") {
    size_t length = 0;
    if (nc_inq_attlen(ncid, var, name, &length) != NC_NOERR) return fallback;
    std::string text(length, '\0');
    if (nc_get_att_text(ncid, var, name, text.data()) != NC_NOERR) return fallback;
    while (!text.empty() && text.back() == '\0') text.pop_back();
    return text;
}

template <typename T>
bool GetNumber(int ncid, int var, const char* name, T& value) {
    double v = 0.0;
    if (nc_get_att_double(ncid, var, name, &v) != NC_NOERR) return false;
    value = static_cast<T>(v);
    return true;
}

// Seconds of one step in the time axis's unit.
double SecondsPer(int timeUnit) {
    double seconds = 1.0;
    qtyConvertUnit(timeUnit, kUnitSecond, seconds);
    return seconds;
}

// The dimensions of an item's axes, named x, y, ... with coordinate variables;
// an item whose axes differ from those of the same name gets its own.
int DefineAxes(int ncid, const XolItemRec& item, int* dimids, GeoHandle frame) {
    for (int d = 0; d < item.dims; ++d) {
        for (int variant = 0;; ++variant) {
            std::string name = kAxisNames[d];
            if (variant > 0) name += "_" + std::to_string(variant);
            int dim = -1;
            if (nc_inq_dimid(ncid, name.c_str(), &dim) == NC_NOERR) {
                size_t length = 0;
                nc_inq_dimlen(ncid, dim, &length);
                int var = -1;
                float origin = 0.0f, spacing = 0.0f;
                nc_inq_varid(ncid, name.c_str(), &var);
                nc_get_att_float(ncid, var, "origin", &origin);
                nc_get_att_float(ncid, var, "spacing", &spacing);
                if (static_cast<int>(length) == item.count[d] && origin == item.origin[d] &&
                    spacing == item.spacing[d]) {
                    dimids[d] = dim;
                    break;
                }
                continue;
            }
            int status = nc_def_dim(ncid, name.c_str(), static_cast<size_t>(item.count[d]), &dim);
            int var = -1;
            if (status == NC_NOERR)
                status = nc_def_var(ncid, name.c_str(), NC_DOUBLE, 1, &dim, &var);
            if (status != NC_NOERR) return NcFail(kXolErrWrite, status, "axis " + name);
            PutText(ncid, var, "units", qtyGetCfUnit(item.axisUnit));
            if (kAxisLetters[d][0] != '\0') PutText(ncid, var, "axis", kAxisLetters[d]);
            double turn = 0.0;
            if (frame != 0 && d < 2 && GeoProjectionNorth(frame, turn) == 0 && turn == 0.0)
                PutText(ncid, var, "standard_name",
                        d == 0 ? "projection_x_coordinate" : "projection_y_coordinate");
            nc_put_att_float(ncid, var, "origin", NC_FLOAT, 1, &item.origin[d]);
            nc_put_att_float(ncid, var, "spacing", NC_FLOAT, 1, &item.spacing[d]);
            nc_put_att_int(ncid, var, "unit_code", NC_INT, 1, &item.axisUnit);
            // The values are written once the file leaves define mode.
            dimids[d] = dim;
            break;
        }
    }
    return 0;
}

// The values of an axis: model coordinates, or projected ones where the grid
// lies unturned on a real map projection, so that the tools of the field
// place it on the earth.
void WriteAxisValues(int ncid, const XolItemRec& item, GeoHandle frame) {
    for (int d = 0; d < item.dims; ++d) {
        for (int variant = 0;; ++variant) {
            std::string name = kAxisNames[d];
            if (variant > 0) name += "_" + std::to_string(variant);
            int var = -1;
            if (nc_inq_varid(ncid, name.c_str(), &var) != NC_NOERR) break;
            float origin = 0, spacing = 0;
            nc_get_att_float(ncid, var, "origin", &origin);
            nc_get_att_float(ncid, var, "spacing", &spacing);
            size_t length = 0;
            int dim = -1;
            nc_inq_vardimid(ncid, var, &dim);
            nc_inq_dimlen(ncid, dim, &length);
            if (static_cast<int>(length) != item.count[d] || origin != item.origin[d] ||
                spacing != item.spacing[d])
                continue;
            std::vector<double> values(length);
            double turn = 0.0;
            const bool projected =
                frame != 0 && d < 2 && GeoProjectionNorth(frame, turn) == 0 && turn == 0.0;
            for (size_t i = 0; i < length; ++i) {
                const double model = static_cast<double>(item.origin[d]) +
                                     static_cast<double>(i) * static_cast<double>(item.spacing[d]);
                double east = model, north = model;
                if (projected)
                    GeoXy2Proj(frame, d == 0 ? model : 0.0, d == 1 ? model : 0.0, east, north);
                values[i] = d == 0 ? east : north;
            }
            const size_t start = 0;
            nc_put_vara_double(ncid, var, &start, &length, values.data());
            break;
        }
    }
}

const char* StandardName(int type);
void DefineProjectedPoints(int ncid, int yDim, int xDim);

int DefineItem(int ncid, const XolItemRec& item, int index, bool dynamic, int timeDim,
               float deleteValue, GeoHandle frame, int& varid) {
    int dims[5];
    int n = 0;
    if (dynamic) dims[n++] = timeDim;
    int axes[4];
    if (int code = DefineAxes(ncid, item, axes, frame)) return code;
    for (int d = item.dims - 1; d >= 0; --d) dims[n++] = axes[d];  // x varies fastest
    std::string name = VariableName(item.name, 0);
    for (int k = 1; nc_inq_varid(ncid, name.c_str(), &varid) == NC_NOERR; ++k)
        name = VariableName(item.name, k);
    const int status = nc_def_var(ncid, name.c_str(), NC_FLOAT, n, dims, &varid);
    if (status != NC_NOERR) return NcFail(kXolErrWrite, status, "item " + item.name);
    nc_def_var_fill(ncid, varid, NC_FILL, &deleteValue);
    PutText(ncid, varid, "long_name", item.name);
    const std::string units = qtyGetCfUnit(item.unit);
    if (!units.empty()) PutText(ncid, varid, "units", units);
    nc_put_att_int(ncid, varid, "item_type", NC_INT, 1, &item.type);
    nc_put_att_int(ncid, varid, "item_unit", NC_INT, 1, &item.unit);
    nc_put_att_int(ncid, varid, "item_number", NC_INT, 1, &index);
    PutText(ncid, varid, "item_kind", dynamic ? "dynamic" : "static");
    if (const char* standard = StandardName(item.type))
        PutText(ncid, varid, "standard_name", standard);
    double turn = 0.0;
    if (frame != 0 && item.dims == 2) {
        PutText(ncid, varid, "grid_mapping", "crs");
        if (GeoProjectionNorth(frame, turn) == 0 && turn != 0.0) {
            DefineProjectedPoints(ncid, axes[1], axes[0]);
            PutText(ncid, varid, "coordinates", "projection_y projection_x");
        }
    }
    return 0;
}

// The CF standard name of an item type, where the table has one.
const char* StandardName(int type) {
    switch (type) {
        case 100078:
            return "sea_surface_height_above_mean_sea_level";
        case 100280:
            return "sea_floor_depth_below_sea_surface";
        case 100097:
            return "sea_surface_wave_significant_height";
        default:
            return nullptr;
    }
}

// The grid mapping of a file on a real map projection: the variable "crs"
// with the CRS as WKT.
void DefineGridMapping(int ncid, const XolHeaderRec& h, GeoHandle frame) {
    std::string wkt;
    GeoCrsWkt(frame, wkt);
    int crs = -1;
    if (nc_def_var(ncid, "crs", NC_INT, 0, nullptr, &crs) != NC_NOERR) return;
    PutText(ncid, crs, "crs_wkt", wkt);
    PutText(ncid, crs, "spatial_ref", wkt);
    PutText(ncid, crs, "long_name", h.projection);
}

// For a grid turned on its map: the projected coordinates of every point as
// two-dimensional auxiliary coordinates.
void DefineProjectedPoints(int ncid, int yDim, int xDim) {
    const int dims[2] = {yDim, xDim};
    const char* names[2] = {"projection_x", "projection_y"};
    for (int a = 0; a < 2; ++a) {
        int var = -1;
        if (nc_inq_varid(ncid, names[a], &var) == NC_NOERR) continue;
        if (nc_def_var(ncid, names[a], NC_DOUBLE, 2, dims, &var) != NC_NOERR) continue;
        PutText(ncid, var, "standard_name",
                a == 0 ? "projection_x_coordinate" : "projection_y_coordinate");
        PutText(ncid, var, "units", "m");
    }
}

void WriteProjectedPoints(int ncid, const XolItemRec& item, GeoHandle frame) {
    int xv = -1, yv = -1;
    if (nc_inq_varid(ncid, "projection_x", &xv) != NC_NOERR ||
        nc_inq_varid(ncid, "projection_y", &yv) != NC_NOERR)
        return;
    const size_t nx = static_cast<size_t>(item.count[0]), ny = static_cast<size_t>(item.count[1]);
    std::vector<double> east(nx * ny), north(nx * ny);
    for (size_t k = 0; k < ny; ++k)
        for (size_t j = 0; j < nx; ++j)
            GeoXy2Proj(frame, item.origin[0] + static_cast<double>(j) * item.spacing[0],
                       item.origin[1] + static_cast<double>(k) * item.spacing[1], east[k * nx + j],
                       north[k * nx + j]);
    nc_put_var_double(ncid, xv, east.data());
    nc_put_var_double(ncid, yv, north.data());
}

void WriteGlobals(int ncid, const XolHeaderRec& h) {
    PutText(ncid, NC_GLOBAL, "Conventions", "CF-1.8");
    PutText(ncid, NC_GLOBAL, "title", h.title);
    PutText(ncid, NC_GLOBAL, "application_title", h.appTitle);
    nc_put_att_int(ncid, NC_GLOBAL, "application_version", NC_INT, 1, &h.version);
    nc_put_att_int(ncid, NC_GLOBAL, "file_type", NC_INT, 1, &h.fileType);
    nc_put_att_int(ncid, NC_GLOBAL, "data_type", NC_INT, 1, &h.dataType);
    nc_put_att_float(ncid, NC_GLOBAL, "delete_value", NC_FLOAT, 1, &h.deleteValue);
    nc_put_att_int(ncid, NC_GLOBAL, "time_axis_type", NC_INT, 1, &h.timeType);
    nc_put_att_int(ncid, NC_GLOBAL, "time_unit", NC_INT, 1, &h.timeUnit);
    nc_put_att_double(ncid, NC_GLOBAL, "time_start_offset", NC_DOUBLE, 1, &h.startOffset);
    nc_put_att_double(ncid, NC_GLOBAL, "time_step", NC_DOUBLE, 1, &h.step);
    nc_put_att_int(ncid, NC_GLOBAL, "time_start_index", NC_INT, 1, &h.startIndex);
    if (h.timeType == kXolTimeCalendar)
        PutText(ncid, NC_GLOBAL, "time_start", h.date + " " + h.time);
    if (h.geo) {
        PutText(ncid, NC_GLOBAL, "projection", h.projection);
        nc_put_att_double(ncid, NC_GLOBAL, "longitude", NC_DOUBLE, 1, &h.longitude);
        nc_put_att_double(ncid, NC_GLOBAL, "latitude", NC_DOUBLE, 1, &h.latitude);
        nc_put_att_double(ncid, NC_GLOBAL, "orientation", NC_DOUBLE, 1, &h.orientation);
    }
    const int blocks = static_cast<int>(h.blocks.size());
    nc_put_att_int(ncid, NC_GLOBAL, "custom_block_count", NC_INT, 1, &blocks);
    for (int b = 0; b < blocks; ++b) {
        const std::string key = "custom_block_" + std::to_string(b + 1);
        const XolBlock& block = h.blocks[static_cast<size_t>(b)];
        PutText(ncid, NC_GLOBAL, (key + "_name").c_str(), block.name);
        nc_put_att_int(ncid, NC_GLOBAL, (key + "_data_type").c_str(), NC_INT, 1, &block.dataType);
        nc_put_att_float(ncid, NC_GLOBAL, key.c_str(), NC_FLOAT, block.values.size(),
                         block.values.data());
    }
}

void UpdateStatistics(XolItemRec& item, const float* values, size_t n, float deleteValue) {
    for (size_t i = 0; i < n; ++i) {
        const float v = values[i];
        if (v == deleteValue) {
            ++item.missing;
            continue;
        }
        if (!item.anyValue) {
            item.minimum = item.maximum = v;
            item.anyValue = true;
        } else {
            item.minimum = std::min<double>(item.minimum, v);
            item.maximum = std::max<double>(item.maximum, v);
        }
    }
}

// Values pass in the item's conversion unit and lie on disk in its unit.
void Convert(const XolItemRec& item, std::vector<float>& values, bool toDisk, float deleteValue) {
    if (item.passUnit < 0 || item.passUnit == item.unit || item.type == 999) return;
    double factor = 1.0;
    if (!(toDisk ? qtyConvertUnit(item.passUnit, item.unit, factor)
                 : qtyConvertUnit(item.unit, item.passUnit, factor)))
        return;
    if (factor == 1.0) return;
    for (float& v : values)
        if (v != deleteValue) v = static_cast<float>(v * factor);
}

// Reads the header of a classic-format file far enough to know where the data
// of every variable ends, so that a file cut short is refused before the
// NetCDF library would hand out fill values for the missing part.
struct HeaderReader {
    const std::string& bytes;
    size_t pos = 0;
    int version = 1;
    bool ok = true;

    uint64_t Read(size_t n) {
        if (!ok || pos + n > bytes.size()) {
            ok = false;
            return 0;
        }
        uint64_t v = 0;
        for (size_t i = 0; i < n; ++i) v = (v << 8) | static_cast<unsigned char>(bytes[pos++]);
        return v;
    }
    uint64_t Count() { return Read(version == 5 ? 8 : 4); }
    void Skip(uint64_t n) {
        const uint64_t padded = (n + 3) / 4 * 4;
        if (!ok || padded > bytes.size() - pos)
            ok = false;
        else
            pos += static_cast<size_t>(padded);
    }
    void SkipName() { Skip(Count()); }
    void SkipAttributes() {
        const uint64_t tag = Read(4), n = Count();
        if (tag != 0 && tag != 0x0C) ok = false;
        static const int kSizes[] = {0, 1, 1, 2, 4, 4, 8, 1, 2, 4, 8, 8};
        for (uint64_t a = 0; a < n && ok; ++a) {
            SkipName();
            const uint64_t type = Read(4), count = Count();
            if (type < 1 || type > 11 || count > bytes.size())
                ok = false;
            else
                Skip(count * static_cast<uint64_t>(kSizes[type]));
        }
    }
};

// The end of the data the header promises; 0 when the header itself is broken.
uint64_t PromisedEnd(const std::string& bytes) {
    HeaderReader r{bytes};
    r.pos = 4;
    r.version = bytes[3];
    uint64_t records = r.Count();
    if (records == 0xFFFFFFFFu) records = 0;  // streaming: no promise
    const uint64_t dimTag = r.Read(4), dims = r.Count();
    if (dimTag != 0 && dimTag != 0x0A) return 0;
    std::vector<uint64_t> lengths;
    for (uint64_t d = 0; d < dims && r.ok && d < bytes.size(); ++d) {
        r.SkipName();
        lengths.push_back(r.Count());
    }
    r.SkipAttributes();
    const uint64_t varTag = r.Read(4), vars = r.Count();
    if (varTag != 0 && varTag != 0x0B) return 0;
    struct Var {
        uint64_t size, begin;
        bool record;
    };
    std::vector<Var> list;
    uint64_t recordSize = 0;
    for (uint64_t v = 0; v < vars && r.ok && v < bytes.size(); ++v) {
        r.SkipName();
        const uint64_t rank = r.Count();
        bool record = false;
        for (uint64_t k = 0; k < rank && r.ok && k < bytes.size(); ++k) {
            const uint64_t id = r.Count();
            if (id >= lengths.size()) return 0;
            if (k == 0 && lengths[id] == 0) record = true;  // the unlimited dimension
        }
        r.SkipAttributes();
        r.Read(4);
        const uint64_t size = r.Read(r.version == 5 ? 8 : 4);
        const uint64_t begin = r.Read(r.version == 1 ? 4 : 8);
        list.push_back({size, begin, record});
        if (record) recordSize += size;
    }
    if (!r.ok) return 0;
    uint64_t end = r.pos;
    for (const Var& v : list) {
        const uint64_t last =
            v.record ? (records == 0 ? 0 : v.begin + (records - 1) * recordSize + v.size)
                     : v.begin + v.size;
        end = std::max(end, last);
    }
    return end;
}

// Checks a file before the NetCDF library sees it, so that a file of another
// kind or one cut short ends in this library's own code and text.
int CheckFile(const std::string& path) {
    struct stat info;
    if (stat(path.c_str(), &info) != 0 || !S_ISREG(info.st_mode))
        return XolFail(kXolErrOpen, "no such file: " + path);
    std::ifstream in(path, std::ios::binary);
    char magic[8] = {};
    in.read(magic, sizeof magic);
    const bool classic = in.gcount() >= 4 && std::memcmp(magic, "CDF", 3) == 0 &&
                         (magic[3] == 1 || magic[3] == 2 || magic[3] == 5);
    const bool hdf = in.gcount() >= 8 && std::memcmp(magic, "\x89HDF\r\n\x1a\n", 8) == 0;
    if (!classic && !hdf) return XolFail(kXolErrOpen, "not a data file: " + path);
    if (classic) {
        std::ifstream whole(path, std::ios::binary);
        const std::string bytes((std::istreambuf_iterator<char>(whole)),
                                std::istreambuf_iterator<char>());
        const uint64_t end = PromisedEnd(bytes);
        if (end == 0) return XolFail(kXolErrFormat, "broken header: " + path);
        // The last record of a file with one record variable may lack its padding.
        if (end > bytes.size() + 3) return XolFail(kXolErrFormat, "file cut short: " + path);
    }
    return 0;
}

}  // namespace

int xolFileCreate(const std::string& path, XolHandle header, XolHandle* file) {
    *file = 0;
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    int ncid = -1;
    int status = nc_create(path.c_str(), NC_CLOBBER | NC_64BIT_DATA, &ncid);
    if (status != NC_NOERR) return NcFail(kXolErrWrite, status, path);
    auto* f = new XolFileRec;
    f->ncid = ncid;
    f->header = h;
    f->writing = true;
    f->path = path;

    int timeDim = -1;
    nc_def_dim(ncid, "time", NC_UNLIMITED, &timeDim);
    nc_def_var(ncid, "time", NC_DOUBLE, 1, &timeDim, &f->timeVar);
    PutText(ncid, f->timeVar, "standard_name", "time");
    PutText(ncid, f->timeVar, "axis", "T");
    if (h->timeType == kXolTimeCalendar) {
        PutText(ncid, f->timeVar, "units", "seconds since " + h->date + " " + h->time);
        PutText(ncid, f->timeVar, "calendar", "proleptic_gregorian");
    } else {
        PutText(ncid, f->timeVar, "units", "s");
    }
    WriteGlobals(ncid, *h);
    if (h->geo && !GeoIsNone(h->projection) &&
        GeoOpen(&f->frame, h->projection, h->longitude, h->latitude, h->orientation) == 0)
        DefineGridMapping(ncid, *h, f->frame);
    for (size_t i = 0; i < h->items.size(); ++i) {
        if (int code = DefineItem(ncid, h->items[i], static_cast<int>(i + 1), true, timeDim,
                                  h->deleteValue, f->frame, h->items[i].varid)) {
            GeoClose(f->frame);
            nc_close(ncid);
            delete f;
            return code;
        }
    }
    // Room in the header for the static items that follow, so that adding
    // them does not move the data.
    status = nc__enddef(ncid, 16384, 4, 0, 4);
    if (status != NC_NOERR) {
        nc_close(ncid);
        delete f;
        return NcFail(kXolErrWrite, status, path);
    }
    for (const auto& item : h->items) {
        WriteAxisValues(ncid, item, f->frame);
        if (f->frame != 0 && item.dims == 2) WriteProjectedPoints(ncid, item, f->frame);
    }
    h->steps = 0;
    *file = XolRegister(f);
    return 0;
}

int xolStaticWrite(XolHandle file, XolHandle staticItem, const float* values) {
    XolFileRec* f = XolFileOf(file);
    XolItemRec* item = XolItemOf(staticItem);
    if (f == nullptr || item == nullptr || !f->writing)
        return XolFail(kXolErrArgument, "bad static write");
    XolHeaderRec& h = *f->header;
    int status = nc_redef(f->ncid);
    if (status != NC_NOERR) return NcFail(kXolErrWrite, status, f->path);
    const int index = -static_cast<int>(h.statics.size());
    if (int code =
            DefineItem(f->ncid, *item, index, false, -1, h.deleteValue, f->frame, item->varid))
        return code;
    status = nc__enddef(f->ncid, 16384, 4, 0, 4);
    if (status != NC_NOERR) return NcFail(kXolErrWrite, status, f->path);
    WriteAxisValues(f->ncid, *item, f->frame);
    if (f->frame != 0 && item->dims == 2) WriteProjectedPoints(f->ncid, *item, f->frame);
    std::vector<float> data(values, values + item->Size());
    Convert(*item, data, true, h.deleteValue);
    UpdateStatistics(*item, data.data(), data.size(), h.deleteValue);
    status = nc_put_var_float(f->ncid, item->varid, data.data());
    return status == NC_NOERR ? 0 : NcFail(kXolErrWrite, status, f->path);
}

int xolWriteItemTimeStep(XolHandle header, XolHandle file, double /*time*/, const float* values) {
    XolHeaderRec* h = XolHeaderOf(header);
    XolFileRec* f = XolFileOf(file);
    if (h == nullptr || f == nullptr || !f->writing || h->items.empty())
        return XolFail(kXolErrArgument, "bad dynamic write");
    XolItemRec& item = h->items[f->nextItem];
    std::vector<float> data(values, values + item.Size());
    Convert(item, data, true, h->deleteValue);
    UpdateStatistics(item, data.data(), data.size(), h->deleteValue);
    size_t start[5] = {f->step, 0, 0, 0, 0};
    size_t count[5] = {1, 1, 1, 1, 1};
    for (int d = 0; d < item.dims; ++d)
        count[1 + d] = static_cast<size_t>(item.count[item.dims - 1 - d]);
    int status = nc_put_vara_float(f->ncid, item.varid, start, count, data.data());
    if (status != NC_NOERR) return NcFail(kXolErrWrite, status, f->path);
    if (++f->nextItem == h->items.size()) {
        // The step is complete: its time goes into the time coordinate.
        const double t = (h->startOffset + static_cast<double>(h->startIndex + f->step) * h->step) *
                         SecondsPer(h->timeUnit);
        status = nc_put_var1_double(f->ncid, f->timeVar, &f->step, &t);
        if (status != NC_NOERR) return NcFail(kXolErrWrite, status, f->path);
        f->nextItem = 0;
        h->steps = static_cast<int>(++f->step);
    }
    return 0;
}

int xolFileFlush(XolHandle file) {
    XolFileRec* f = XolFileOf(file);
    if (f == nullptr) return XolFail(kXolErrArgument, "not a file");
    const int status = nc_sync(f->ncid);
    return status == NC_NOERR ? 0 : NcFail(kXolErrWrite, status, f->path);
}

int xolFileClose(XolHandle file) {
    XolFileRec* f = XolFileOf(file);
    if (f == nullptr) return XolFail(kXolErrArgument, "not a file");
    const int status = nc_close(f->ncid);
    GeoClose(f->frame);
    XolForget(f);
    const std::string path = f->path;
    delete f;
    return status == NC_NOERR ? 0 : NcFail(kXolErrWrite, status, path);
}

// ---- reading ---------------------------------------------------------------

namespace {

// The axes of a variable's spatial dimensions, from the coordinate variables
// where there are some: origin and spacing, which must be equidistant.
int ReadAxes(int ncid, int var, bool timeFirst, XolItemRec& item) {
    int ndims = 0;
    nc_inq_varndims(ncid, var, &ndims);
    std::vector<int> dims(static_cast<size_t>(ndims));
    nc_inq_vardimid(ncid, var, dims.data());
    const int first = timeFirst ? 1 : 0;
    item.dims = ndims - first;
    if (item.dims > 4) return XolFail(kXolErrFormat, "more than four spatial axes: " + item.name);
    static const int kTypes[] = {kXolAxisNone, kXolAxisEq1, kXolAxisEq2, kXolAxisEq3, kXolAxisEq4};
    item.axisType = kTypes[item.dims];
    for (int d = 0; d < item.dims; ++d) {
        const int dim =
            dims[static_cast<size_t>(ndims - 1 - d)];  // the last dimension varies fastest
        char name[NC_MAX_NAME + 1] = {};
        size_t length = 0;
        nc_inq_dim(ncid, dim, name, &length);
        item.count[d] = static_cast<int>(length);
        item.origin[d] = 0.0f;
        item.spacing[d] = 1.0f;
        int coord = -1;
        if (nc_inq_varid(ncid, name, &coord) != NC_NOERR) continue;
        std::vector<double> values(length);
        if (nc_get_var_double(ncid, coord, values.data()) != NC_NOERR) continue;
        float origin = static_cast<float>(values[0]);
        float spacing = length > 1 ? static_cast<float>(values[1] - values[0]) : 0.0f;
        GetNumber(ncid, coord, "origin", origin);
        GetNumber(ncid, coord, "spacing", spacing);
        for (size_t i = 1; i < length; ++i) {
            const double expected = values[0] + static_cast<double>(i) * (values[1] - values[0]);
            if (std::fabs(values[i] - expected) > 1e-4 * std::fabs(values[1] - values[0]))
                return XolFail(kXolErrFormat, std::string("axis ") + name + " is not equidistant");
        }
        item.origin[d] = origin;
        item.spacing[d] = spacing;
        if (!GetNumber(ncid, coord, "unit_code", item.axisUnit)) {
            const int unit = qtyUnitFromCf(GetText(ncid, coord, "units", "m"));
            item.axisUnit = unit > 0 ? unit : kUnitMetre;
        }
    }
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
    h.steps = static_cast<int>(steps);
    nc_inq_varid(ncid, "time", &timeVar);
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
        return 0;
    }
    // A file made by another tool: the axis from the time coordinate.
    if (timeVar < 0) return 0;
    const std::string units = GetText(ncid, timeVar, "units", "s");
    const size_t since = units.find(" since ");
    h.timeType = since == std::string::npos ? kXolTimeRelative : kXolTimeCalendar;
    if (since != std::string::npos && units.size() >= since + 7 + 10) {
        h.date = units.substr(since + 7, 10);
        h.time = units.size() >= since + 7 + 19 ? units.substr(since + 18, 8) : "00:00:00";
    }
    const int unit = qtyUnitFromCf(since == std::string::npos ? units : units.substr(0, since));
    h.timeUnit = unit > 0 ? unit : kUnitSecond;
    std::vector<double> t(steps);
    if (steps > 0 && nc_get_var_double(ncid, timeVar, t.data()) != NC_NOERR)
        return XolFail(kXolErrFormat, "unreadable time coordinate");
    h.startOffset = steps > 0 ? t[0] : 0.0;
    h.step = steps > 1 ? t[1] - t[0] : 1.0;
    for (size_t i = 2; i < steps; ++i)
        if (std::fabs(t[i] - t[0] - static_cast<double>(i) * h.step) > 1e-6 * std::fabs(h.step) * i)
            return XolFail(kXolErrFormat, "the time axis is not equidistant");
    return 0;
}

}  // namespace

int xolFileRead(const std::string& path, XolHandle* header, XolHandle* file) {
    *header = 0;
    *file = 0;
    if (int code = CheckFile(path)) return code;
    int ncid = -1;
    int status = nc_open(path.c_str(), NC_NOWRITE, &ncid);
    if (status != NC_NOERR) return NcFail(kXolErrOpen, status, path);
    auto h = std::make_unique<XolHeaderRec>();
    h->title = GetText(ncid, NC_GLOBAL, "title");
    h->appTitle = GetText(ncid, NC_GLOBAL, "application_title");
    GetNumber(ncid, NC_GLOBAL, "application_version", h->version);
    GetNumber(ncid, NC_GLOBAL, "file_type", h->fileType);
    GetNumber(ncid, NC_GLOBAL, "data_type", h->dataType);
    const bool deleteGiven = GetNumber(ncid, NC_GLOBAL, "delete_value", h->deleteValue);
    h->projection = GetText(ncid, NC_GLOBAL, "projection");
    h->geo = !h->projection.empty();
    GetNumber(ncid, NC_GLOBAL, "longitude", h->longitude);
    GetNumber(ncid, NC_GLOBAL, "latitude", h->latitude);
    GetNumber(ncid, NC_GLOBAL, "orientation", h->orientation);
    int blocks = 0;
    GetNumber(ncid, NC_GLOBAL, "custom_block_count", blocks);
    for (int b = 1; b <= blocks; ++b) {
        const std::string key = "custom_block_" + std::to_string(b);
        size_t length = 0;
        nc_inq_attlen(ncid, NC_GLOBAL, key.c_str(), &length);
        std::vector<float> values(length);
        if (length > 0) nc_get_att_float(ncid, NC_GLOBAL, key.c_str(), values.data());
        int dataType = 1;
        GetNumber(ncid, NC_GLOBAL, (key + "_data_type").c_str(), dataType);
        h->blocks.push_back(XolBlock{dataType, GetText(ncid, NC_GLOBAL, (key + "_name").c_str()),
                                     std::move(values), 0});
    }
    for (size_t b = 1; b < h->blocks.size(); ++b)
        h->blocks[b - 1].next = static_cast<XolHandle>(reinterpret_cast<uintptr_t>(&h->blocks[b]));

    int timeDim = -1, timeVar = -1;
    if (int code = ReadTimeAxis(ncid, *h, timeDim, timeVar)) {
        nc_close(ncid);
        return code;
    }
    if (timeDim < 0) h->steps = 1;

    // Items: every variable that is no coordinate and no grid mapping, in file order.
    int nvars = 0;
    nc_inq_nvars(ncid, &nvars);
    std::vector<XolItemRec> dynamic;
    for (int var = 0; var < nvars; ++var) {
        char name[NC_MAX_NAME + 1] = {};
        int ndims = 0, type = 0;
        nc_inq_var(ncid, var, name, &type, &ndims, nullptr, nullptr);
        int dimid = -1;
        if (nc_inq_dimid(ncid, name, &dimid) == NC_NOERR) continue;  // a coordinate
        if (std::strcmp(name, "crs") == 0 || GetText(ncid, var, "grid_mapping_name") != "")
            continue;
        // Auxiliary coordinates are no items.
        const std::string standard = GetText(ncid, var, "standard_name");
        if (standard == "projection_x_coordinate" || standard == "projection_y_coordinate" ||
            standard == "latitude" || standard == "longitude")
            continue;
        if (type != NC_FLOAT && type != NC_DOUBLE && type != NC_SHORT && type != NC_INT &&
            type != NC_BYTE)
            continue;
        std::vector<int> dims(static_cast<size_t>(ndims));
        nc_inq_vardimid(ncid, var, dims.data());
        const bool timeFirst = ndims > 0 && dims[0] == timeDim;
        // A file without time (a map made with another tool) is one step of dynamic items.
        const bool isDynamic = timeFirst || timeDim < 0;
        XolItemRec item;
        item.varid = var;
        item.name = GetText(ncid, var, "long_name", name);
        if (!GetNumber(ncid, var, "item_type", item.type)) item.type = 999;
        if (!GetNumber(ncid, var, "item_unit", item.unit)) {
            const int unit = qtyUnitFromCf(GetText(ncid, var, "units", ""));
            item.unit = unit > 0 ? unit : 0;
        }
        if (!deleteGiven) GetNumber(ncid, var, "_FillValue", h->deleteValue);
        if (int code = ReadAxes(ncid, var, timeFirst, item)) {
            nc_close(ncid);
            return code;
        }
        if (isDynamic)
            dynamic.push_back(std::move(item));
        else
            h->statics.push_back(std::make_unique<XolItemRec>(std::move(item)));
    }
    h->items = std::move(dynamic);
    for (auto& item : h->items) XolRegister(&item);
    for (auto& item : h->statics) XolRegister(item.get());

    auto* f = new XolFileRec;
    f->ncid = ncid;
    f->header = h.get();
    f->path = path;
    f->timeVar = timeVar;
    f->timeless = timeDim < 0;
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
    XolItemRec& item = *f->header->statics[f->staticCursor++];
    item.data.resize(item.Size());
    if (nc_get_var_float(f->ncid, item.varid, item.data.data()) != NC_NOERR) return 0;
    Convert(item, item.data, false, f->header->deleteValue);
    return static_cast<XolHandle>(reinterpret_cast<uintptr_t>(&item));
}

int xolStaticGetData(XolHandle staticItem, float* values) {
    const XolItemRec* item = XolItemOf(staticItem);
    if (item == nullptr || item->data.size() != item->Size())
        return XolFail(kXolErrRead, "no data of a static item");
    std::copy(item->data.begin(), item->data.end(), values);
    return 0;
}

namespace {

int NextItem(XolHeaderRec* h, XolFileRec* f, double* time, float* values) {
    if (h == nullptr || f == nullptr || h->items.empty())
        return XolFail(kXolErrArgument, "bad read");
    if (f->step >= static_cast<size_t>(h->steps)) return XolFail(kXolErrEnd, "no more steps");
    XolItemRec& item = h->items[f->nextItem];
    if (values != nullptr) {
        size_t start[5] = {f->step, 0, 0, 0, 0};
        size_t count[5] = {1, 1, 1, 1, 1};
        for (int d = 0; d < item.dims; ++d)
            count[1 + d] = static_cast<size_t>(item.count[item.dims - 1 - d]);
        std::vector<float> data(item.Size());
        // A file without time has no time index in front.
        const int skip = f->timeless ? 1 : 0;
        const int status =
            nc_get_vara_float(f->ncid, item.varid, start + skip, count + skip, data.data());
        if (status != NC_NOERR) return NcFail(kXolErrRead, status, f->path);
        Convert(item, data, false, h->deleteValue);
        std::copy(data.begin(), data.end(), values);
    }
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
