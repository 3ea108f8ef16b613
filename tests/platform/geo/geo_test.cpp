#include "platform/geo/geo.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <sstream>

#include "support/test_support.hpp"

namespace {

// Projects a point with the cs2cs program of the PROJ tools, longitude first.
bool Cs2cs(const std::string& crs, double lon, double lat, double& east, double& north) {
    bwtest::TempDir dir;
    char input[64];
    std::snprintf(input, sizeof input, "%.10f %.10f\n", lon, lat);
    bwtest::WriteFile(dir / "in.txt", input);
    auto r = bwtest::RunProgram(
        {"/bin/sh", "-c", "cs2cs -f %.6f +proj=longlat +datum=WGS84 +to " + crs + " < in.txt"},
        dir.path.string());
    std::istringstream out(r.out);
    return r.exitCode == 0 && static_cast<bool>(out >> east >> north);
}

TEST(MapFrame, ProjectionsAgreeWithTheProjTools) {
    const struct {
        const char* projection;
        const char* crs;
        double lon, lat;
    } cases[] = {
        {"UTM-32", "EPSG:32632", 9.5, 54.25},
        {"UTM-31", "EPSG:32631", 4.1, 52.0},
        {"EPSG:28992", "EPSG:28992", 4.9, 52.37},
        {"+proj=tmerc +lat_0=0 +lon_0=3 +k=0.9996 +x_0=500000 +datum=WGS84 +units=m",
         "+proj=tmerc +lat_0=0 +lon_0=3 +k=0.9996 +x_0=500000 +datum=WGS84 +units=m", 3.7, 51.3}};
    for (const auto& c : cases) {
        GeoHandle frame = 0;
        ASSERT_EQ(GeoOpen(&frame, c.projection, c.lon, c.lat, 0.0), 0) << GeoLastError();
        for (double dlon : {0.0, 0.05, -0.2}) {
            double e1 = 0, n1 = 0, e2 = 0, n2 = 0;
            ASSERT_EQ(GeoGeo2Proj(frame, c.lon + dlon, c.lat - dlon, e1, n1), 0);
            ASSERT_TRUE(Cs2cs(c.crs, c.lon + dlon, c.lat - dlon, e2, n2)) << c.crs;
            EXPECT_NEAR(e1, e2, 1e-5) << c.projection;  // cs2cs prints micrometres
            EXPECT_NEAR(n1, n2, 1e-5) << c.projection;
            double lon = 0, lat = 0;
            GeoProj2Geo(frame, e1, n1, lon, lat);
            // Back to within a millimetre: far below what 32-bit coordinates in a file keep.
            EXPECT_NEAR(lon, c.lon + dlon, 1e-8);
            EXPECT_NEAR(lat, c.lat - dlon, 1e-8);
        }
        GeoClose(frame);
    }
}

TEST(MapFrame, ModelCoordinatesTurnWithTheGrid) {
    GeoHandle frame = 0;
    ASSERT_EQ(GeoOpen(&frame, "UTM-32", 9.5, 54.25, 30.0), 0);
    double lon = 0, lat = 0;
    GeoXy2Geo(frame, 0.0, 0.0, lon, lat);
    EXPECT_NEAR(lon, 9.5, 1e-12);  // the model's origin is the origin given
    EXPECT_NEAR(lat, 54.25, 1e-12);
    double e0 = 0, n0 = 0, e = 0, n = 0;
    GeoXy2Proj(frame, 0.0, 0.0, e0, n0);
    GeoXy2Proj(frame, 0.0, 100.0, e, n);  // 100 m along the grid's y axis, 30 degrees east of north
    EXPECT_NEAR(e - e0, 50.0, 1e-9);
    EXPECT_NEAR(n - n0, 100.0 * std::cos(M_PI / 6), 1e-9);
    double x = 0, y = 0;
    GeoGeo2Xy(frame, 9.6, 54.3, x, y);
    GeoXy2Geo(frame, x, y, lon, lat);
    EXPECT_NEAR(lon, 9.6, 1e-10);
    EXPECT_NEAR(lat, 54.3, 1e-10);
    double north = 0;
    GeoProjectionNorth(frame, north);
    EXPECT_EQ(north, -30.0);

    // True north, checked against the direction of a short step due north.
    for (double plon : {9.0, 11.5, 6.5}) {
        GeoGeo2Xy(frame, plon, 54.0, x, y);
        double x2 = 0, y2 = 0, degrees = 0;
        GeoGeo2Xy(frame, plon, 54.0001, x2, y2);
        ASSERT_EQ(GeoTrueNorth(frame, x, y, degrees), 0);
        EXPECT_NEAR(degrees, std::atan2(x2 - x, y2 - y) * 180.0 / M_PI, 1e-3) << plon;
    }
    GeoClose(frame);
}

TEST(MapFrame, NoProjectionPassesCoordinatesAndTextsAreChecked) {
    GeoHandle frame = 0;
    ASSERT_EQ(GeoOpen(&frame, "NON-UTM", 1000.0, 2000.0, 45.0), 0);
    double e = 0, n = 0, x = 0, y = 0, north = 0;
    GeoGeo2Proj(frame, 12.0, 34.0, e, n);
    EXPECT_EQ(e, 12.0);
    EXPECT_EQ(n, 34.0);
    GeoGeo2Xy(frame, 1010.0, 2020.0, x, y);  // orientation is 0 without a projection
    EXPECT_EQ(x, 10.0);
    EXPECT_EQ(y, 20.0);
    GeoProjectionNorth(frame, north);
    EXPECT_EQ(north, 0.0);
    std::string wkt;
    GeoCrsWkt(frame, wkt);
    EXPECT_EQ(wkt, "");
    GeoClose(frame);

    EXPECT_EQ(GeoOpen(&frame, "UTM-61", 0, 0, 0), kGeoErrProjection);
    EXPECT_EQ(GeoOpen(&frame, "no such thing", 0, 0, 0), kGeoErrProjection);
    EXPECT_EQ(GeoXy2Geo(12345, 0, 0, e, n), kGeoErrHandle);

    ASSERT_EQ(GeoOpen(&frame, "UTM-32", 9.0, 54.0, 0.0), 0);
    GeoCrsWkt(frame, wkt);
    EXPECT_NE(wkt.find("UTM zone 32N"), std::string::npos);
    std::string name;
    GeoProjectionName(frame, name);
    EXPECT_EQ(name, "WGS 84 / UTM zone 32N");
    GeoClose(frame);
    EXPECT_TRUE(GeoIdentical("UTM-32", "EPSG:32632"));
    EXPECT_FALSE(GeoIdentical("UTM-32", "UTM-33"));
    EXPECT_TRUE(GeoIdentical("LONG/LAT", "long/lat"));
}

}  // namespace
