// Rasters in and out through GDAL. A raster's geotransform places its cells on
// the map; the model grid needs them square and unturned, with row k = 0 the
// southernmost, whichever way the raster stores its rows. Out, a map becomes a
// north-up Float32 GeoTIFF, as GIS tools expect.
#include "bwdata/raster.hpp"

#include <cpl_conv.h>
#include <cpl_error.h>
#include <cpl_string.h>
#include <gdal.h>
#include <ogr_srs_api.h>

#include <cfloat>
#include <cmath>
#include <cstdio>

#include "data/geoframe.hpp"
#include "data/xolfile.hpp"
#include "platform/geo/geo.hpp"

namespace {

// GDAL's own messages stay quiet; the last one explains a failure.
struct QuietGdal {
    QuietGdal() {
        GDALAllRegister();
        // A NetCDF grid written by xarray names its axes x and y but may give
        // them no units or standard names; they still place the grid.
        if (CPLGetConfigOption("GDAL_NETCDF_IGNORE_XY_AXIS_NAME_CHECKS", nullptr) == nullptr)
            CPLSetConfigOption("GDAL_NETCDF_IGNORE_XY_AXIS_NAME_CHECKS", "YES");
        CPLPushErrorHandler(CPLQuietErrorHandler);
        CPLErrorReset();
    }
    ~QuietGdal() { CPLPopErrorHandler(); }
    QuietGdal(const QuietGdal&) = delete;
    QuietGdal& operator=(const QuietGdal&) = delete;
};

std::string GdalReason() {
    const char* text = CPLGetLastErrorMsg();
    return text && *text ? std::string(": ") + text : "";
}

// A number as short as it reads back, for messages.
std::string Short(double v) {
    char text[32];
    std::snprintf(text, sizeof text, "%.10g", v);
    return text;
}

bool EndsWith(const std::string& text, const std::string& end) {
    return text.size() >= end.size() &&
           text.compare(text.size() - end.size(), end.size(), end) == 0;
}

// The names of the grids of a container (a NetCDF file of several variables)
// that opens as no raster of its own, as GDAL names them for opening.
std::string Subdatasets(GDALDatasetH ds) {
    std::string names;
    char** list = GDALGetMetadata(ds, "SUBDATASETS");
    for (int n = 0; list && list[n]; ++n) {
        const char* value = nullptr;
        char* key = nullptr;
        value = CPLParseNameValue(list[n], &key);
        if (key && value && EndsWith(key, "_NAME")) names += std::string("\n  ") + value;
        CPLFree(key);
    }
    return names;
}

// The most a data file keeps of a projection text.
constexpr size_t kProjectionLength = 1024;

// A CRS as WKT of the given format on one line; empty when it has none.
std::string Wkt(OGRSpatialReferenceH srs, const char* format) {
    char* wkt = nullptr;
    const std::string option = std::string("FORMAT=") + format;
    const char* const options[] = {option.c_str(), "MULTILINE=NO", nullptr};
    std::string text;
    if (OSRExportToWktEx(srs, &wkt, options) == OGRERR_NONE && wkt) text = wkt;
    CPLFree(wkt);
    return text;
}

// The projection text of a raster's CRS, or "NON-UTM" for none or a local
// frame. A geographic CRS is refused, the grid being in metres. A CRS that is
// identical to one with an authority code becomes that code ("EPSG:25832"),
// short and exact; else it is kept as WKT, which must fit the data file.
std::string RasterProjection(GDALDatasetH ds, const std::string& input, std::string& projection) {
    OGRSpatialReferenceH srs = GDALGetSpatialRef(ds);
    projection = "NON-UTM";
    if (srs == nullptr || OSRIsLocal(srs)) return "";
    const char* name = OSRGetName(srs);
    const std::string crs = name ? name : "of the raster";
    if (OSRIsGeographic(srs))
        return input + ": the CRS " + crs +
               " is geographic (degrees), but the model grid is in metres: reproject the raster "
               "on a map projection first (gdalwarp -t_srs)";
    if (!OSRIsProjected(srs)) return input + ": the CRS " + crs + " is not a map projection";
    const std::string wkt = Wkt(srs, "WKT2_2019");
    if (wkt.empty()) return input + ": the CRS " + crs + " has no WKT form" + GdalReason();
    std::string code;
    bool same = false;
    if (GeoShortName(wkt, code) == 0 && GeoIdentical(code, wkt, same) == 0 && same) {
        projection = code;
        return "";
    }
    for (const std::string& text : {wkt, Wkt(srs, "WKT1")})
        if (!text.empty() && text.size() <= kProjectionLength) {
            projection = text;
            return "";
        }
    return input + ": the WKT of the CRS " + crs + " is longer than the " +
           std::to_string(kProjectionLength) +
           " characters a data file keeps: give the CRS with --projection";
}

// Band `band` of an open raster into `grid`, rows turned so that k = 0 is the
// southernmost and columns so that j grows eastward.
std::string ReadGrid(GDALDatasetH ds, int band, const std::string& input, MapGrid& grid) {
    const int bands = GDALGetRasterCount(ds);
    if (bands == 0) {
        const std::string names = Subdatasets(ds);
        if (names.empty()) return input + ": holds no raster band";
        return input + ": holds several grids; import one of them by its name:" + names;
    }
    if (band < 1 || band > bands)
        return input + ": there is no band " + std::to_string(band) + " (the raster has " +
               std::to_string(bands) + ")";
    double gt[6] = {0, 1, 0, 0, 0, 1};
    if (GDALGetGeoTransform(ds, gt) != CE_None)
        return input + ": the raster has no geotransform, so its cells have no size or place";
    if (gt[2] != 0.0 || gt[4] != 0.0)
        return input +
               ": the raster is turned on its map (its geotransform has the rotation "
               "terms " +
               Short(gt[2]) + " and " + Short(gt[4]) +
               "); the model grid lies unturned on it: warp the raster north-up first (gdalwarp)";
    const double dx = std::fabs(gt[1]), dy = std::fabs(gt[5]);
    if (!(dx > 0.0) || !(dy > 0.0) || std::fabs(dx - dy) > 1e-9 * std::max(dx, dy))
        return input + ": the cells are " + Short(dx) + " by " + Short(dy) +
               ", but the model grid needs square cells: resample the raster first "
               "(gdalwarp -tr)";
    const long nx = GDALGetRasterXSize(ds), ny = GDALGetRasterYSize(ds);
    GDALRasterBandH b = GDALGetRasterBand(ds, band);
    std::vector<double> raw(static_cast<size_t>(nx) * ny);
    if (GDALRasterIO(b, GF_Read, 0, 0, static_cast<int>(nx), static_cast<int>(ny), raw.data(),
                     static_cast<int>(nx), static_cast<int>(ny), GDT_Float64, 0, 0) != CE_None)
        return input + ": band " + std::to_string(band) + " can't be read" + GdalReason();
    int hasNoData = 0, hasScale = 0, hasOffset = 0;
    const double noData = GDALGetRasterNoDataValue(b, &hasNoData);
    double scale = GDALGetRasterScale(b, &hasScale);
    double offset = GDALGetRasterOffset(b, &hasOffset);
    if (!hasScale) scale = 1.0;
    if (!hasOffset) offset = 0.0;

    grid.columns = nx;
    grid.rows = ny;
    grid.cell = dx;
    grid.values.assign(raw.size(), kDeleteValue);
    const bool northUp = gt[5]<0.0, eastward = gt[1]> 0.0;
    for (long r = 0; r < ny; ++r)
        for (long c = 0; c < nx; ++c) {
            const double v = raw[static_cast<size_t>(r) * nx + c];
            if (std::isnan(v) || (hasNoData && v == noData)) continue;
            const double value = v * scale + offset;
            if (!std::isfinite(value) || std::fabs(value) > FLT_MAX)
                return input + ": the value " + Short(value) + " at column " + std::to_string(c) +
                       ", row " + std::to_string(r) + " is too large for a 32-bit value";
            const long k = northUp ? ny - 1 - r : r;
            const long j = eastward ? c : nx - 1 - c;
            grid.values[static_cast<size_t>(k) * nx + j] = static_cast<float>(value);
        }
    // The centre of the cell that is westernmost and southernmost.
    grid.x0 = gt[0] + (eastward ? 0.5 : nx - 0.5) * gt[1];
    grid.y0 = gt[3] + (northUp ? ny - 0.5 : 0.5) * gt[5];
    return "";
}

// The values of map item `item` at step `step` (or of static item
// `staticItem`) of an open file.
std::string ReadMap(XolFile& f, int item, int step, int staticItem, const std::string& input,
                    std::vector<float>& values, std::string& name, std::string& unit) {
    int status = 0;
    if (staticItem > 0) {
        if (staticItem > f.noStaticItems)
            return input + ": there is no static item " + std::to_string(staticItem) +
                   " (the file has " + std::to_string(f.noStaticItems) + ")";
        for (int n = 1; n <= staticItem && status == 0; ++n)
            XolReadStatic(f, values.data(), &status);
        name = f.staticItems[staticItem - 1].name;
        unit = f.staticItems[staticItem - 1].unitText;
        return status == 0 ? "" : input + ": " + XolErrorText(status);
    }
    if (item < 1 || item > f.noDynamicItems)
        return input + ": there is no item " + std::to_string(item) + " (the file has " +
               std::to_string(f.noDynamicItems) + ")";
    const int last = step < 0 ? f.noTimeSteps - 1 : step;
    if (last < 0 || last >= f.noTimeSteps)
        return input + ": there is no step " + std::to_string(step) + " (the file has " +
               std::to_string(f.noTimeSteps) + ")";
    for (int s = 0; s <= last && status == 0; ++s)
        for (int n = 1; n <= f.noDynamicItems && status == 0; ++n) {
            if (s == last && n == item)
                XolReadDynamic(f, values.data(), &status);
            else
                XolSkipDynamic(f, &status);
        }
    name = f.dynamicItems[item - 1].name;
    unit = f.dynamicItems[item - 1].unitText;
    return status == 0 ? "" : input + ": " + XolErrorText(status);
}

// Where the grid's lower-left cell centre lies on the map and the map's CRS as
// WKT (empty on no map). A grid turned on its map has no north-up raster form.
std::string PlaceOnMap(const XolFile& f, const std::string& input, double& x, double& y,
                       std::string& wkt) {
    x = f.axes[0].origin;
    y = f.axes[1].origin;
    wkt.clear();
    if (f.projection.empty() || GeoIsNone(f.projection)) return "";
    GeoHandle frame = 0;
    int status = 0;
    GeoFrameOpen(frame, f.projection, f.longitude, f.latitude, f.orientation, &status);
    if (status != 0)
        return input + ": the file's projection " + f.projection + " is not understood";
    double north = 0.0;
    GeoFrameGetProjectionNorth(frame, north, &status);
    if (north != 0.0) {
        GeoClose(frame);
        return input + ": the grid is turned " + Short(-north) +
               " degrees on its map, which a north-up raster can't hold: export it as .csv";
    }
    GeoFrameXy2Proj(frame, x, y, x, y, &status);
    if (status == 0) status = GeoCrsWkt(frame, wkt);
    GeoClose(frame);
    return status == 0 ? "" : input + ": the grid's origin can't be placed on its map";
}

// Writes the GeoTIFF under `path`; what is wrong, or empty.
std::string WriteTiff(const std::string& path, const std::string& output, const XolFile& f,
                      const std::vector<float>& values, const double gt[6], const std::string& wkt,
                      const std::string& name, const std::string& unit) {
    const int nx = f.axes[0].count, ny = f.axes[1].count;
    GDALDriverH driver = GDALGetDriverByName("GTiff");
    if (driver == nullptr) return output + ": GDAL has no GeoTIFF driver";
    const char* const options[] = {"COMPRESS=DEFLATE", nullptr};
    GDALDatasetH ds =
        GDALCreate(driver, path.c_str(), nx, ny, 1, GDT_Float32, const_cast<char**>(options));
    if (ds == nullptr) return output + ": can't be written" + GdalReason();
    std::string error;
    GDALSetGeoTransform(ds, const_cast<double*>(gt));
    if (!wkt.empty()) {
        OGRSpatialReferenceH srs = OSRNewSpatialReference(nullptr);
        if (OSRSetFromUserInput(srs, wkt.c_str()) != OGRERR_NONE) {
            error = output + ": GDAL does not take the file's projection" + GdalReason();
        } else {
            // Easting first, whatever order the CRS's own axes have.
            OSRSetAxisMappingStrategy(srs, OAMS_TRADITIONAL_GIS_ORDER);
            GDALSetSpatialRef(ds, srs);
        }
        OSRDestroySpatialReference(srs);
    }
    GDALRasterBandH band = GDALGetRasterBand(ds, 1);
    GDALSetRasterNoDataValue(band, f.deleteValue);
    GDALSetDescription(band, name.c_str());
    GDALSetRasterUnitType(band, unit.c_str());
    // The northernmost row (k = K) first.
    std::vector<float> rows(values.size());
    for (int r = 0; r < ny; ++r)
        for (int j = 0; j < nx; ++j)
            rows[static_cast<size_t>(r) * nx + j] =
                values[static_cast<size_t>(ny - 1 - r) * nx + j];
    if (error.empty() && GDALRasterIO(band, GF_Write, 0, 0, nx, ny, rows.data(), nx, ny,
                                      GDT_Float32, 0, 0) != CE_None)
        error = output + ": can't be written" + GdalReason();
    GDALClose(ds);
    if (error.empty() && CPLGetLastErrorType() >= CE_Failure)
        error = output + ": can't be written" + GdalReason();
    return error;
}

}  // namespace

bool IsRasterOutput(const std::string& output) {
    return EndsWith(output, ".tif") || EndsWith(output, ".tiff") || EndsWith(output, ".TIF") ||
           EndsWith(output, ".TIFF");
}

std::string ImportRaster(const std::string& input, const std::string& output,
                         const RasterOptions& options) {
    if (options.orientationGiven)
        return "import-raster takes no --orientation: the raster's geotransform places the grid";
    QuietGdal quiet;
    GDALDatasetH ds =
        GDALOpenEx(input.c_str(), GDAL_OF_RASTER | GDAL_OF_READONLY, nullptr, nullptr, nullptr);
    if (ds == nullptr) return input + ": can't be opened as a raster" + GdalReason();
    MapGrid grid;
    AscOptions map = options.map;
    std::string projection;
    std::string error = ReadGrid(ds, options.band, input, grid);
    if (error.empty() && map.projection.empty()) error = RasterProjection(ds, input, projection);
    GDALClose(ds);
    if (!error.empty()) return error;
    if (map.projection.empty()) {
        map.projection = projection;
        // The CRS must be one the model's map frame takes, too.
        GeoHandle frame = 0;
        if (!GeoIsNone(projection)) {
            if (GeoOpen(&frame, projection, 0.0, 0.0, 0.0) != 0)
                return input + ": the raster's CRS is not taken: " + GeoLastError();
            GeoClose(frame);
        }
    }
    map.orientation = 0.0;  // unturned on its map
    return WriteMapFile(grid, input, output, map);
}

std::string ExportRaster(const std::string& input, const std::string& output, int item, int step,
                         int staticItem) {
    int status = 0;
    XolFile f = XolOpenRead(input, &status);
    if (status != 0) return input + ": " + XolErrorText(status);
    if (f.dimension != 2) {
        XolClose(f);
        return input + ": only a map is exported as a raster, the file has " +
               std::to_string(f.dimension) + " dimensions";
    }
    const int nx = f.axes[0].count, ny = f.axes[1].count;
    std::vector<float> values(static_cast<size_t>(nx) * ny);
    std::string name, unit, wkt;
    double x0 = 0, y0 = 0;
    std::string error = ReadMap(f, item, step, staticItem, input, values, name, unit);
    if (error.empty()) error = PlaceOnMap(f, input, x0, y0, wkt);
    if (!error.empty()) {
        XolClose(f);
        return error;
    }
    // To the micrometre, as the .asc export: the origin went through
    // longitude and latitude and comes back with round-off below that.
    x0 = std::round(x0 * 1e6) / 1e6;
    y0 = std::round(y0 * 1e6) / 1e6;
    const double dx = f.axes[0].spacing, dy = f.axes[1].spacing;
    const double gt[6] = {x0 - 0.5 * dx, dx, 0.0, y0 + (ny - 0.5) * dy, 0.0, -dy};
    QuietGdal quiet;
    const std::string part = output + ".part";
    error = WriteTiff(part, output, f, values, gt, wkt, name, unit);
    XolClose(f);
    if (error.empty() && std::rename(part.c_str(), output.c_str()) != 0)
        error = output + ": can't be written";
    if (!error.empty()) std::remove(part.c_str());
    return error;
}
