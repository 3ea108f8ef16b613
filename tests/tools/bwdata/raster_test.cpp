// Rasters through bwdata: GeoTIFFs and NetCDF grids in, GeoTIFFs out. The
// rasters are made and read back with GDAL itself, positions checked against
// PROJ's own command line tool.
#include <cpl_conv.h>
#include <gdal.h>
#include <gtest/gtest.h>
#include <ogr_srs_api.h>

#include <cmath>
#include <filesystem>
#include <sstream>

#include "data/xolfile.hpp"
#include "support/test_support.hpp"
#include "tools/bwdata/tool_fixture.hpp"

namespace fs = std::filesystem;

namespace {

// A single-band Float32 raster: cells as stored (row 0 first), CRS as GDAL
// takes it ("EPSG:25832") and nodata -9999.
struct Raster {
    int nx = 4, ny = 3;
    double gt[6] = {600000, 10, 0, 6000030, 0, -10};
    std::string crs = "EPSG:25832";
    double noData = -9999;
    std::vector<float> values = {1, 2, 3, 4, 5, -9999, 7, 8, 9, 10, 11, 12.5f};
};

void WriteTiff(const std::string& path, Raster r) {
    GDALAllRegister();
    GDALDatasetH ds =
        GDALCreate(GDALGetDriverByName("GTiff"), path.c_str(), r.nx, r.ny, 1, GDT_Float32, nullptr);
    ASSERT_NE(ds, nullptr) << path;
    GDALSetGeoTransform(ds, r.gt);
    OGRSpatialReferenceH srs = OSRNewSpatialReference(nullptr);
    if (OSRSetFromUserInput(srs, r.crs.c_str()) == OGRERR_NONE) GDALSetSpatialRef(ds, srs);
    OSRDestroySpatialReference(srs);
    GDALRasterBandH band = GDALGetRasterBand(ds, 1);
    GDALSetRasterNoDataValue(band, r.noData);
    EXPECT_EQ(GDALRasterIO(band, GF_Write, 0, 0, r.nx, r.ny, r.values.data(), r.nx, r.ny,
                           GDT_Float32, 0, 0),
              CE_None);
    GDALClose(ds);
}

Raster ReadTiff(const std::string& path) {
    Raster r;
    GDALDatasetH ds = GDALOpen(path.c_str(), GA_ReadOnly);
    if (ds == nullptr) return Raster{.nx = 0, .ny = 0};
    r.nx = GDALGetRasterXSize(ds);
    r.ny = GDALGetRasterYSize(ds);
    GDALGetGeoTransform(ds, r.gt);
    char* wkt = nullptr;
    OSRExportToWkt(GDALGetSpatialRef(ds), &wkt);
    r.crs = wkt ? wkt : "";
    CPLFree(wkt);
    GDALRasterBandH band = GDALGetRasterBand(ds, 1);
    r.noData = GDALGetRasterNoDataValue(band, nullptr);
    r.values.resize(static_cast<size_t>(r.nx) * r.ny);
    if (GDALRasterIO(band, GF_Read, 0, 0, r.nx, r.ny, r.values.data(), r.nx, r.ny, GDT_Float32, 0,
                     0) != CE_None)
        r.values.clear();
    GDALClose(ds);
    return r;
}

// A data file's header and its one map (row k = 0 first).
XolFile ReadMap(const std::string& path, std::vector<float>& values) {
    int status = 0;
    XolFile f = XolOpenRead(path, &status);
    values.assign(status == 0 ? static_cast<size_t>(f.axes[0].count) * f.axes[1].count : 0, 0);
    if (status == 0) XolReadDynamic(f, values.data(), &status);
    XolClose(f);
    return f;
}

const std::string kWgs84 = "+proj=longlat +datum=WGS84 +no_defs";

// PROJ's cs2cs on one point.
void Cs2cs(const std::string& from, const std::string& to, double a, double b, double& c,
           double& d) {
    std::ostringstream point;
    point.precision(17);
    point << a << " " << b << "\n";
    const auto r = bwtest::RunProgramWithInput({"/usr/bin/cs2cs", "-f", "%.12f", from, "+to", to},
                                               ".", point.str());
    std::istringstream out(r.out);
    ASSERT_TRUE(out >> c >> d) << r.err;
}

// Degrees clockwise from true north to the north of map `crs` at lon, lat,
// from a short step north projected.
double Convergence(const std::string& crs, double lon, double lat) {
    double e0 = 0, n0 = 0, e1 = 0, n1 = 0;
    Cs2cs(kWgs84, crs, lon, lat, e0, n0);
    Cs2cs(kWgs84, crs, lon, lat + 1e-3, e1, n1);
    return -std::atan2(e1 - e0, n1 - n0) * 180.0 / 3.14159265358979323846;
}

using RasterTool = DataTool;

// 4 x 3 cells of 10 m on ETRS89 / UTM 32N, well off the central meridian so
// that true and map north differ. The northernmost row is the last of the
// file, nodata its delete value; the origin is the lower-left cell centre
// where PROJ puts it, turned to the map's north. A bottom-up raster of the
// same cells gives the same file, and the export puts the original back.
TEST_F(RasterTool, GeoTiffComesInSouthRowFirstAndGoesBackOnItsMap) {
    const Raster north;
    WriteTiff(dir / "north.tif", north);
    Ok({"import-raster", "north.tif", "-o", "north.xol2"});
    std::vector<float> values;
    const XolFile m = ReadMap(dir / "north.xol2", values);
    ASSERT_EQ(values.size(), 12u);
    EXPECT_EQ(m.axes[0].count, 4);
    EXPECT_EQ(m.axes[1].spacing, 10.0f);
    for (int k = 0; k < 3; ++k)
        for (int j = 0; j < 4; ++j) {
            const float in = north.values[(2 - k) * 4 + j];
            EXPECT_EQ(values[k * 4 + j], in == -9999.0f ? kDeleteValue : in) << j << "," << k;
        }
    EXPECT_EQ(m.projection, "EPSG:25832");
    double lon = 0, lat = 0;
    Cs2cs("EPSG:25832", kWgs84, 600005, 6000005, lon, lat);
    EXPECT_NEAR(m.longitude, lon, 1e-9);
    EXPECT_NEAR(m.latitude, lat, 1e-9);
    EXPECT_NEAR(m.orientation, Convergence("EPSG:25832", lon, lat), 1e-5);
    EXPECT_GT(m.orientation, 1.0);

    Raster south = north;
    south.gt[3] = 6000000;
    south.gt[5] = 10;
    for (int r = 0; r < 3; ++r)
        for (int c = 0; c < 4; ++c) south.values[r * 4 + c] = north.values[(2 - r) * 4 + c];
    WriteTiff(dir / "south.tif", south);
    Ok({"import-raster", "south.tif", "-o", "south.xol2"});
    std::vector<float> southValues;
    EXPECT_EQ(ReadMap(dir / "south.xol2", southValues).longitude, m.longitude);
    EXPECT_EQ(southValues, values);

    Ok({"export", "north.xol2", "-o", "back.tif"});
    const Raster back = ReadTiff(dir / "back.tif");
    ASSERT_EQ(back.values.size(), 12u);
    for (int i = 0; i < 6; ++i) EXPECT_NEAR(back.gt[i], north.gt[i], 1e-6) << i;
    OGRSpatialReferenceH a = OSRNewSpatialReference(back.crs.c_str());
    OGRSpatialReferenceH b = OSRNewSpatialReference(nullptr);
    OSRImportFromEPSG(b, 25832);
    EXPECT_TRUE(a && OSRIsSame(a, b)) << back.crs;
    OSRDestroySpatialReference(a);
    OSRDestroySpatialReference(b);
    EXPECT_EQ(static_cast<float>(back.noData), kDeleteValue);
    for (size_t i = 0; i < 12; ++i)
        EXPECT_EQ(back.values[i], north.values[i] == -9999.0f ? kDeleteValue : north.values[i]);
}

// An ASCII grid records its orientation as a raster does: the turn on the map
// plus the meridian convergence. A grid turned on its map has no north-up
// raster.
TEST_F(RasterTool, AsciiGridsRecordTheirOrientationFromTrueNorth) {
    bwtest::WriteFile(dir / "g.asc",
                      "ncols 2\nnrows 2\nxllcenter 600005\nyllcenter 6000005\ncellsize 10\n"
                      "1 2\n3 4\n");
    Ok({"import-asc", "g.asc", "-o", "plain.xol2", "--projection", "EPSG:25832"});
    Ok({"import-asc", "g.asc", "-o", "turned.xol2", "--projection", "EPSG:25832", "--orientation",
        "20"});
    std::vector<float> values;
    const XolFile plain = ReadMap(dir / "plain.xol2", values);
    const double convergence = Convergence("EPSG:25832", plain.longitude, plain.latitude);
    EXPECT_NEAR(plain.orientation, convergence, 1e-5);
    EXPECT_NEAR(ReadMap(dir / "turned.xol2", values).orientation, 20.0 + convergence, 1e-5);
    Ok({"export", "plain.xol2", "-o", "plain.tif"});
    EXPECT_NEAR(ReadTiff(dir / "plain.tif").gt[0], 600000, 1e-6);
    Refused({"export", "turned.xol2", "-o", "turned.tif"},
            "turned.xol2: the grid is turned 20 degrees on its map, which a north-up raster "
            "can't hold");
}

// NetCDF grids as xarray writes them, y falling: the CRS from the grid
// mapping's crs_wkt/spatial_ref, or none, which is a local frame.
TEST_F(RasterTool, NetcdfGridsFromXarrayComeInTheRightWayUp) {
    const auto wkt = bwtest::RunProgram(
        {"/usr/bin/projinfo", "EPSG:25832", "-o", "WKT1_GDAL", "-q", "--single-line"}, ".");
    bwtest::WriteFile(  // grid.nc with the CRS, local.nc without
        dir / "grid.py",
        "import sys\ntry:\n    import numpy as np, xarray as xr\nexcept ImportError:\n"
        "    sys.exit(77)\n"
        "x = 600005.0 + 10.0 * np.arange(4)\ny = 6000025.0 - 10.0 * np.arange(3)\n"
        "v = np.array([[1, 2, 3, 4], [5, np.nan, 7, 8], [9, 10, 11, 12.5]], dtype='f4')\n"
        "ds = xr.Dataset({'depth': (('y', 'x'), v)}, coords={'y': y, 'x': x})\n"
        "ds.to_netcdf('local.nc')\n"
        "wkt = sys.argv[1].strip()\n"
        "ds['spatial_ref'] = xr.DataArray(0, attrs={'crs_wkt': wkt, 'spatial_ref': wkt})\n"
        "ds['depth'].attrs['grid_mapping'] = 'spatial_ref'\nds.to_netcdf('grid.nc')\n");
    const auto made = bwtest::RunProgram({"/usr/bin/python3", "grid.py", wkt.out}, dir.path);
    if (made.exitCode == 77) GTEST_SKIP() << "no xarray for /usr/bin/python3";
    ASSERT_EQ(made.exitCode, 0) << made.err;
    WriteTiff(dir / "north.tif", Raster{});
    Ok({"import-raster", "north.tif", "-o", "north.xol2"});
    Ok({"import-raster", "grid.nc", "-o", "grid.xol2", "--name", "Depth"});
    Ok({"import-raster", "local.nc", "-o", "local.xol2"});
    std::vector<float> tifValues, gridValues, localValues;
    const XolFile tif = ReadMap(dir / "north.xol2", tifValues);
    const XolFile grid = ReadMap(dir / "grid.xol2", gridValues);
    const XolFile local = ReadMap(dir / "local.xol2", localValues);
    // The last row of the variable (y smallest) is k = 0; NaN is missing.
    ASSERT_EQ(gridValues.size(), 12u);
    EXPECT_EQ(gridValues[0], 9.0f);
    EXPECT_EQ(gridValues[4 + 1], kDeleteValue);
    EXPECT_EQ(gridValues, tifValues);
    EXPECT_EQ(grid.projection, "EPSG:25832");
    EXPECT_EQ(grid.longitude, tif.longitude);
    EXPECT_EQ(grid.orientation, tif.orientation);
    EXPECT_EQ(localValues, tifValues);
    EXPECT_EQ(local.axes[0].spacing, 10.0f);
    EXPECT_EQ(local.projection, "NON-UTM");
    EXPECT_EQ(local.longitude, 0.0);
}

// What the model grid can't be made of is refused with the reason, and
// nothing is written.
TEST_F(RasterTool, RastersTheGridCantHoldAreRefused) {
    Raster turned, geographic, oblong;
    turned.gt[2] = turned.gt[4] = 1.0;
    geographic = Raster{.gt = {8.0, 0.001, 0, 54.0, 0, -0.001}, .crs = "EPSG:4326"};
    oblong.gt[5] = -20;
    for (const auto& [name, raster] : {std::pair<std::string, Raster>{"turned.tif", turned},
                                       {"geographic.tif", geographic},
                                       {"oblong.tif", oblong},
                                       {"north.tif", Raster{}}})
        WriteTiff(dir / name, raster);
    bwtest::WriteFile(dir / "text.tif", "not a raster\n");
    Refused({"import-raster", "turned.tif", "-o", "out.xol2"},
            "turned.tif: the raster is turned on its map (its geotransform has the rotation "
            "terms 1 and 1)");
    Refused({"import-raster", "geographic.tif", "-o", "out.xol2"},
            "geographic.tif: the CRS WGS 84 is geographic (degrees), but the model grid is in "
            "metres");
    Refused({"import-raster", "oblong.tif", "-o", "out.xol2"},
            "oblong.tif: the cells are 10 by 20, but the model grid needs square cells");
    Refused({"import-raster", "north.tif", "--band", "2", "-o", "out.xol2"},
            "north.tif: there is no band 2 (the raster has 1)");
    Refused({"import-raster", "text.tif", "-o", "out.xol2"},
            "text.tif: can't be opened as a raster");
    Refused({"import-raster", "north.tif", "--orientation", "5", "-o", "out.xol2"},
            "import-raster takes no --orientation");
    bwtest::WriteFile(dir / "s.csv", "time,a\n0,1\n1,2\n");
    Ok({"import-csv", "s.csv", "-o", "s.xol0", "--start", "2004-01-01 00:00:00"});
    Refused({"export", "s.xol0", "-o", "s.tif"},
            "s.xol0: only a map is exported as a raster, the file has 0 dimensions");
    // --projection overrides the raster's CRS.
    Ok({"import-raster", "north.tif", "-o", "utm.xol2", "--projection", "UTM-32"});
    std::vector<float> values;
    EXPECT_EQ(ReadMap(dir / "utm.xol2", values).projection, "UTM-32");
}

}  // namespace
