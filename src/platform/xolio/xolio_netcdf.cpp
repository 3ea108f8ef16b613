// Data files on disk: NetCDF in the classic format with 64-bit offsets, written record
// by record and synchronised on every flush, so that a file a run is still
// writing can be read by another process and a file whose writer died stays
// readable up to its last flushed step.
#include <netcdf.h>

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "platform/geo/geo.hpp"
#include "platform/qty/qty.hpp"
#include "platform/xolio/xolio_record.hpp"

namespace {

const char* kAxisNames[] = {"x", "y", "z", "w"};
const char* kAxisLetters[] = {"X", "Y", "Z", ""};

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
            if (status != NC_NOERR) return XolNcFail(kXolErrWrite, status, "axis " + name);
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
// place it on the earth. The header's place is that of the first point.
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
            // The file's longitude and latitude are those of its first point,
            // from which the points lie a spacing apart on the grid.
            for (size_t i = 0; i < length; ++i) {
                const double step = static_cast<double>(i) * static_cast<double>(item.spacing[d]);
                double east = 0.0, north = 0.0;
                if (projected)
                    GeoXy2Proj(frame, d == 0 ? step : 0.0, d == 1 ? step : 0.0, east, north);
                else
                    east = north = static_cast<double>(item.origin[d]) + step;
                values[i] = d == 0 ? east : north;
            }
            const size_t start = 0;
            nc_put_vara_double(ncid, var, &start, &length, values.data());
            break;
        }
    }
}

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
    if (status != NC_NOERR) return XolNcFail(kXolErrWrite, status, "item " + item.name);
    nc_def_var_fill(ncid, varid, NC_FILL, &deleteValue);
    PutText(ncid, varid, "long_name", item.name);
    const std::string units = qtyGetCfUnit(item.unit);
    if (!units.empty()) PutText(ncid, varid, "units", units);
    nc_put_att_int(ncid, varid, "item_type", NC_INT, 1, &item.type);
    nc_put_att_int(ncid, varid, "item_unit", NC_INT, 1, &item.unit);
    nc_put_att_int(ncid, varid, "item_number", NC_INT, 1, &index);
    PutText(ncid, varid, "item_kind", dynamic ? "dynamic" : "static");
    for (const XolAttribute& a : item.attributes) {
        if (a.values.empty())
            PutText(ncid, varid, a.name.c_str(), a.text);
        else
            nc_put_att_double(ncid, varid, a.name.c_str(), NC_DOUBLE, a.values.size(),
                              a.values.data());
    }
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

// The grid mapping of a file on a real map projection: the variable "crs"
// with the CF parameters of its projection and the CRS as WKT.
void DefineGridMapping(int ncid, const XolHeaderRec& h) {
    std::vector<GeoCfAttribute> attributes;
    GeoCfGridMapping(h.projection, attributes);
    int crs = -1;
    if (nc_def_var(ncid, "crs", NC_INT, 0, nullptr, &crs) != NC_NOERR) return;
    PutText(ncid, crs, "long_name", h.projection);
    for (const GeoCfAttribute& a : attributes) {
        if (a.values.empty())
            PutText(ncid, crs, a.name.c_str(), a.text);
        else
            nc_put_att_double(ncid, crs, a.name.c_str(), NC_DOUBLE, a.values.size(),
                              a.values.data());
    }
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
            GeoXy2Proj(frame, static_cast<double>(j) * item.spacing[0],
                       static_cast<double>(k) * item.spacing[1], east[k * nx + j],
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

}  // namespace

int XolNcFail(int code, int status, const std::string& what) {
    // NetCDF hands on the errno of a failed system call as a positive status.
    const std::string reason = status > 0 ? XolSystemText(status) : nc_strerror(status);
    return XolFail(code, what.empty() ? reason : what + ": " + reason);
}

void XolConvert(const XolItemRec& item, float* values, size_t n, bool toDisk, float deleteValue) {
    if (item.passUnit < 0 || item.passUnit == item.unit || item.type == 999) return;
    double factor = 1.0;
    if (!(toDisk ? qtyConvertUnit(item.passUnit, item.unit, factor)
                 : qtyConvertUnit(item.unit, item.passUnit, factor)))
        return;
    if (factor == 1.0) return;
    for (size_t i = 0; i < n; ++i)
        if (values[i] != deleteValue) values[i] = static_cast<float>(values[i] * factor);
}

int xolFileCreate(const std::string& path, XolHandle header, XolHandle* file) {
    *file = 0;
    XolHeaderRec* h = XolHeaderOf(header);
    if (h == nullptr) return XolFail(kXolErrArgument, "not a header");
    // The classic format with 64-bit offsets, which every reader of the field
    // opens, holds a variable of up to 4 GiB a step; a file with a larger one
    // is NetCDF-4.
    bool fits = true;
    for (const auto& item : h->items) fits = fits && item.Size() < (size_t{1} << 30) - 1;
    int ncid = -1;
    int status = nc_create(path.c_str(), NC_CLOBBER | (fits ? NC_64BIT_OFFSET : NC_NETCDF4), &ncid);
    if (status != NC_NOERR) return XolNcFail(kXolErrWrite, status);
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
        DefineGridMapping(ncid, *h);
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
        return XolNcFail(kXolErrWrite, status);
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
    if (status != NC_NOERR) return XolNcFail(kXolErrWrite, status);
    const int index = -static_cast<int>(h.statics.size());
    if (int code =
            DefineItem(f->ncid, *item, index, false, -1, h.deleteValue, f->frame, item->varid))
        return code;
    status = nc__enddef(f->ncid, 16384, 4, 0, 4);
    if (status != NC_NOERR) return XolNcFail(kXolErrWrite, status);
    WriteAxisValues(f->ncid, *item, f->frame);
    if (f->frame != 0 && item->dims == 2) WriteProjectedPoints(f->ncid, *item, f->frame);
    std::vector<float> data(values, values + item->Size());
    XolConvert(*item, data.data(), data.size(), true, h.deleteValue);
    UpdateStatistics(*item, data.data(), data.size(), h.deleteValue);
    status = nc_put_var_float(f->ncid, item->varid, data.data());
    return status == NC_NOERR ? 0 : XolNcFail(kXolErrWrite, status);
}

int xolWriteItemTimeStep(XolHandle header, XolHandle file, double /*time*/, const float* values) {
    XolHeaderRec* h = XolHeaderOf(header);
    XolFileRec* f = XolFileOf(file);
    if (h == nullptr || f == nullptr || !f->writing || h->items.empty())
        return XolFail(kXolErrArgument, "bad dynamic write");
    XolItemRec& item = h->items[f->nextItem];
    std::vector<float> data(values, values + item.Size());
    XolConvert(item, data.data(), data.size(), true, h->deleteValue);
    UpdateStatistics(item, data.data(), data.size(), h->deleteValue);
    size_t start[5] = {f->step, 0, 0, 0, 0};
    size_t count[5] = {1, 1, 1, 1, 1};
    for (int d = 0; d < item.dims; ++d)
        count[1 + d] = static_cast<size_t>(item.count[item.dims - 1 - d]);
    int status = nc_put_vara_float(f->ncid, item.varid, start, count, data.data());
    if (status != NC_NOERR) return XolNcFail(kXolErrWrite, status);
    if (++f->nextItem == h->items.size()) {
        // The step is complete: its time goes into the time coordinate.
        const double t = (h->startOffset + static_cast<double>(h->startIndex + f->step) * h->step) *
                         SecondsPer(h->timeUnit);
        status = nc_put_var1_double(f->ncid, f->timeVar, &f->step, &t);
        if (status != NC_NOERR) return XolNcFail(kXolErrWrite, status);
        f->nextItem = 0;
        h->steps = static_cast<int>(++f->step);
    }
    return 0;
}

int xolFileFlush(XolHandle file) {
    XolFileRec* f = XolFileOf(file);
    if (f == nullptr) return XolFail(kXolErrArgument, "not a file");
    const int status = nc_sync(f->ncid);
    return status == NC_NOERR ? 0 : XolNcFail(kXolErrWrite, status);
}

int xolFileClose(XolHandle file) {
    XolFileRec* f = XolFileOf(file);
    if (f == nullptr) return XolFail(kXolErrArgument, "not a file");
    const int status = nc_close(f->ncid);
    GeoClose(f->frame);
    XolForget(f);
    // The items of a file read stay with its header, but can read no more.
    for (auto& item : f->header->items) item.source = nullptr;
    for (auto& item : f->header->statics) item->source = nullptr;
    const bool writing = f->writing;
    delete f;
    if (status == NC_NOERR) return 0;
    return XolNcFail(writing ? kXolErrWrite : kXolErrRead, status);
}
