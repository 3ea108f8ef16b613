// Results as the tools of the field see them: a run on a grid that lies
// unturned on a map projection, well east of the zone's central meridian, is
// opened by GDAL (gdalinfo) and by xarray, and each must place the map where
// the bathymetry lay: the corner, the pixel size and the CRS. Its point file
// tells where each gauge is, and bwdata writes the map as an ASCII grid at
// the same place.
#include <gtest/gtest.h>

#include <cmath>
#include <regex>

#include "platform/geo/geo.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

constexpr const char* kCrs = "EPSG:25832";
constexpr double kLon = 10.5, kLat = 54.0;

// Two numbers of a gdalinfo line such as "Origin = (601234.5,6000000.25)".
bool Pair(const std::string& text, const std::string& label, double& a, double& b) {
    std::smatch m;
    const std::regex pattern(label + R"( = \(([-0-9.eE+]+),([-0-9.eE+]+)\))");
    if (!std::regex_search(text, m, pattern)) return false;
    a = std::stod(m[1]);
    b = std::stod(m[2]);
    return true;
}

TEST(GisTools, AProjectedResultLiesWhereItsBathymetryLay) {
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    grid.J = 12, grid.K = 9, grid.dx = 2.0f, grid.dy = 2.0f;
    grid.projection = kCrs, grid.longitude = kLon, grid.latitude = kLat;
    ASSERT_EQ(GeoOrientationOnMap(kCrs, kLon, kLat, 0.0, grid.orientation), 0);
    ASSERT_GT(grid.orientation, 1.0);  // true north is well off grid north here
    std::vector<float> bed = bwtest::Constant(grid, 1.0f);
    for (int k = 1; k < grid.K; ++k)
        for (int j = 1; j < grid.J; ++j) bed[k * (grid.J + 1) + j] = -2.0f;
    bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
    const bwtest::RunResult run = bwtest::RunModel(dir, 4, 0.1, {{"Output_Deterministic_2D", R"(
Number_Of_Records = 2
Output_Spec_Data_1 {
    File_Name = file("map.xol2")
    X_Range_And_Interval = 2, 11, 1
    Y_Range_And_Interval = 3, 8, 1
    First_Time_step = 0
    Last_Time_step = 4
    Time_Step_Interval = 1
    Number_Of_Items = 3
    Item_Numbers = 1, 2, 9
}
Output_Spec_Data_2 {
    File_Name = file("gauges.xol0")
    X_Range_And_Interval = 4, 7
    Y_Range_And_Interval = 5, 2
    NO_OF_POINTS = 2
    First_Time_step = 0
    Last_Time_step = 4
    Time_Step_Interval = 1
    Number_Of_Items = 1
    Item_Numbers = 1
}
)"}});
    ASSERT_EQ(run.exitCode, 0) << run.out << run.err;

    // Where grid point (2, 3) lies on the map, and the map's north-west corner
    // as GDAL gives it: half a cell beyond the outer points.
    GeoHandle frame = 0;
    ASSERT_EQ(GeoOpen(&frame, kCrs, kLon, kLat, grid.orientation), 0);
    double east = 0, north = 0, turn = 1;
    GeoXy2Proj(frame, 2 * 2.0, 3 * 2.0, east, north);
    GeoProjectionNorth(frame, turn);
    ASSERT_EQ(turn, 0.0);
    const double west = east - 1.0, top = north + 5 * 2.0 + 1.0;

    const auto info = bwtest::RunProgram(
        {"/usr/bin/gdalinfo", "NETCDF:\"map.xol2\":Surface_elevation"}, dir.path.string());
    ASSERT_EQ(info.exitCode, 0) << info.err;
    double x = 0, y = 0, sx = 0, sy = 0;
    ASSERT_TRUE(Pair(info.out, "Origin", x, y)) << info.out;
    ASSERT_TRUE(Pair(info.out, "Pixel Size", sx, sy)) << info.out;
    EXPECT_NEAR(x, west, 1e-3);
    EXPECT_NEAR(y, top, 1e-3);
    EXPECT_NEAR(sx, 2.0, 1e-9);
    EXPECT_NEAR(sy, -2.0, 1e-9);
    EXPECT_NE(info.out.find("Size is 10, 6"), std::string::npos) << info.out;
    EXPECT_NE(info.out.find("ETRS89 / UTM zone 32N"), std::string::npos) << info.out;
    EXPECT_NE(info.out.find("ID[\"EPSG\",25832]"), std::string::npos) << info.out;

    // xarray: projected axes in metres, the grid mapping of CF, a standard
    // name on the surface and none claiming a depth for the bed levels.
    const auto xr = bwtest::RunProgram(
        {"/usr/bin/python3", "-c",
         "import xarray as xr\n"
         "d = xr.open_dataset('map.xol2')\n"
         "s = d['Surface_elevation']\n"
         "print(repr(float(d.x[0])), repr(float(d.y[-1])), s.shape,\n"
         "      d[s.attrs['grid_mapping']].attrs['grid_mapping_name'],\n"
         "      s.attrs['standard_name'], d['Still_water_depth'].attrs.get('standard_name'),\n"
         "      float(d['Still_water_depth'][-1, 2, 3]))\n"},
        dir.path.string());
    ASSERT_EQ(xr.exitCode, 0) << xr.err;
    std::smatch m;
    ASSERT_TRUE(std::regex_search(xr.out, m,
                                  std::regex(R"(^([-0-9.e+]+) ([-0-9.e+]+) \(5, 6, 10\) )"
                                             R"(transverse_mercator )"
                                             R"(sea_surface_height_above_geopotential_datum )"
                                             R"(None -2.0)")))
        << xr.out;
    EXPECT_NEAR(std::stod(m[1]), east, 1e-3);
    EXPECT_NEAR(std::stod(m[2]), north + 10.0, 1e-3);

    // The gauges: their grid index, metres on the grid and place on the map.
    const auto header =
        bwtest::RunProgram({"/usr/bin/ncdump", "-h", "gauges.xol0"}, dir.path.string());
    ASSERT_EQ(header.exitCode, 0);
    double e7 = 0, n7 = 0;
    GeoXy2Proj(frame, 7 * 2.0, 2 * 2.0, e7, n7);
    GeoClose(frame);
    EXPECT_NE(header.out.find(":grid_index = 7., 2. ;"), std::string::npos) << header.out;
    EXPECT_NE(header.out.find(":position = 14., 4. ;"), std::string::npos) << header.out;
    ASSERT_TRUE(std::regex_search(header.out, m,
                                  std::regex(R"(P_7_2_Surface_elevation:projected_position = )"
                                             R"(([0-9.]+), ([0-9.]+) ;)")))
        << header.out;
    EXPECT_NEAR(std::stod(m[1]), e7, 1e-3);
    EXPECT_NEAR(std::stod(m[2]), n7, 1e-3);

    // An ASCII grid of the map: the lower-left cell's corner on the map.
    const auto asc = bwtest::RunProgram(
        {bwtest::BuiltProgram("bwdata"), "export", "map.xol2", "-o", "map.asc", "--item", "1"},
        dir.path.string());
    ASSERT_EQ(asc.exitCode, 0) << asc.err;
    const std::string text = bwtest::ReadFile(dir / "map.asc");
    ASSERT_TRUE(
        std::regex_search(text, m, std::regex(R"(xllcenter ([0-9.]+)\nyllcenter ([0-9.]+))")))
        << text;
    EXPECT_NEAR(std::stod(m[1]), east, 1e-3);
    EXPECT_NEAR(std::stod(m[2]), north, 1e-3);
}

}  // namespace
