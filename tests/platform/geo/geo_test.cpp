#include "platform/geo/geo.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <sstream>
#include <tuple>
#include <utility>
#include <vector>

#include "support/test_support.hpp"

namespace {

// Transforms points with the cs2cs program of the PROJ tools: the two
// coordinates of each in the order the source CRS wants them, the two results
// in the order of the target CRS.
std::vector<std::pair<double, double>> Cs2cs(const std::string& crsPair,
                                             const std::vector<std::pair<double, double>>& in) {
    bwtest::TempDir dir;
    std::string input;
    for (const auto& [a, b] : in) {
        char line[64];
        std::snprintf(line, sizeof line, "%.10f %.10f\n", a, b);
        input += line;
    }
    bwtest::WriteFile(dir / "in.txt", input);
    auto r = bwtest::RunProgram({"/bin/sh", "-c", "cs2cs -f %.6f " + crsPair + " < in.txt"},
                                dir.path.string());
    std::vector<std::pair<double, double>> out;
    std::istringstream lines(r.out);
    std::string line;
    while (r.exitCode == 0 && std::getline(lines, line)) {
        std::istringstream fields(line);
        double a = 0, b = 0;
        if (fields >> a >> b) out.emplace_back(a, b);
    }
    return out;
}

bool Cs2cs(const std::string& crsPair, double a, double b, double& out1, double& out2) {
    const auto out = Cs2cs(crsPair, {{a, b}});
    if (out.size() != 1) return false;
    std::tie(out1, out2) = out[0];
    return true;
}

bool Cs2csFromWgs84(const std::string& crs, double lon, double lat, double& east, double& north) {
    return Cs2cs("+proj=longlat +datum=WGS84 +to " + crs, lon, lat, east, north);
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
            ASSERT_TRUE(Cs2csFromWgs84(c.crs, c.lon + dlon, c.lat - dlon, e2, n2)) << c.crs;
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
    GeoClose(frame);
}

// True north at a point, against cs2cs: a short step due north on the
// projection's own datum, projected, gives the direction of the meridian on
// the map. Cases: a turned grid, a datum other than WGS 84, a CRS with a
// height, a PROJ string with a datum shift, a point far from the central
// meridian. (North on a shifted datum differs from that of WGS 84 by a few
// arcseconds; the frame takes the projection's own.)
TEST(MapFrame, TrueNorthFollowsTheMeridianConvergence) {
    const struct {
        const char* projection;
        const char* cs2cs;  // from the projection's geographic CRS to the projection
        bool latFirst;      // the geographic CRS wants latitude first
        double lon, lat, orientation;
    } cases[] = {
        {"UTM-32", "+proj=longlat +datum=WGS84 +to EPSG:32632", false, 9.5, 54.25, 30.0},
        {"EPSG:27700", "EPSG:4277 EPSG:27700", true, -1.5, 53.0, -12.0},
        {"EPSG:25832+5783", "EPSG:4258 EPSG:25832", true, 8.0, 50.0, 0.0},
        {"+proj=utm +zone=32 +ellps=intl +towgs84=-87,-98,-121",
         "+proj=longlat +ellps=intl +type=crs +to +proj=utm +zone=32 +ellps=intl +type=crs", false,
         10.0, 56.0, 5.0},
        {"+proj=tmerc +lon_0=3 +k=0.9996 +x_0=500000 +datum=WGS84",
         "+proj=longlat +datum=WGS84 +to +proj=tmerc +lon_0=3 +k=0.9996 +x_0=500000 +datum=WGS84",
         false, 7.0, 51.0, 0.0},
    };
    for (const auto& c : cases) {
        GeoHandle frame = 0;
        ASSERT_EQ(GeoOpen(&frame, c.projection, c.lon, c.lat, c.orientation), 0)
            << c.projection << ": " << GeoLastError();
        for (double plon : {c.lon - 1.5, c.lon + 2.0}) {
            // The point and steps of 0.001 degrees north and south of it.
            std::vector<std::pair<double, double>> points;
            for (double dlat : {0.0, 1e-3, -1e-3})
                points.emplace_back(c.latFirst ? std::make_pair(c.lat + dlat, plon)
                                               : std::make_pair(plon, c.lat + dlat));
            const auto p = Cs2cs(c.cs2cs, points);
            ASSERT_EQ(p.size(), 3u) << c.cs2cs;
            // The meridian's direction on the map, then on the grid turned by the orientation.
            const double expected =
                std::atan2(p[1].first - p[2].first, p[1].second - p[2].second) * 180.0 / M_PI -
                c.orientation;
            double x = 0, y = 0, degrees = 0;
            GeoProj2Xy(frame, p[0].first, p[0].second, x, y);
            ASSERT_EQ(GeoTrueNorth(frame, x, y, degrees), 0) << c.projection;
            EXPECT_NEAR(degrees, expected, 1e-6) << c.projection << " at " << plon;
        }
        // Whatever the text, the data files get the WKT of a CRS, not of a bare conversion.
        std::string wkt;
        GeoCrsWkt(frame, wkt);
        EXPECT_TRUE(wkt.rfind("PROJCRS[", 0) == 0 || wkt.rfind("COMPOUNDCRS[", 0) == 0 ||
                    wkt.rfind("BOUNDCRS[", 0) == 0)
            << c.projection << ": " << wkt.substr(0, 40);
        GeoClose(frame);
    }
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
    // A grid in metres can't lie on longitude and latitude under a CRS's name.
    EXPECT_EQ(GeoOpen(&frame, "EPSG:4326", 0, 0, 0), kGeoErrProjection);
    EXPECT_EQ(GeoOpen(&frame, "+proj=longlat +datum=WGS84", 0, 0, 0), kGeoErrProjection);
    EXPECT_EQ(GeoXy2Geo(12345, 0, 0, e, n), kGeoErrHandle);

    ASSERT_EQ(GeoOpen(&frame, "UTM-32", 9.0, 54.0, 0.0), 0);
    GeoCrsWkt(frame, wkt);
    EXPECT_NE(wkt.find("UTM zone 32N"), std::string::npos);
    std::string name;
    GeoProjectionName(frame, name);
    EXPECT_EQ(name, "WGS 84 / UTM zone 32N");
    GeoClose(frame);
}

// The calls on a projection text alone: its origin, its short name, and
// whether two texts name one CRS.
TEST(MapFrame, ProjectionTextsAreComparedAndNamed) {
    const struct {
        const char* projection;
        double lon, lat;
        const char* shortName;
    } cases[] = {
        {"UTM-32", 9.0, 0.0, "UTM-32"},
        {"+proj=utm +zone=31 +datum=WGS84", 3.0, 0.0, "UTM-31"},
        {"EPSG:28992", 5.38763888888889, 52.1561605555556, "EPSG:28992"},  // oblique stereographic
        {"EPSG:3034", 10.0, 52.0, "EPSG:3034"},                            // Lambert, false origin
        {"EPSG:25832+5783", 9.0, 0.0, "EPSG:5555"},                        // the code of this pair
        {"NON-UTM", 0.0, 0.0, "NON-UTM"},
    };
    for (const auto& c : cases) {
        double lon = -1, lat = -1;
        ASSERT_EQ(GeoProjectionOrigin(c.projection, lon, lat), 0) << c.projection;
        EXPECT_NEAR(lon, c.lon, 1e-9) << c.projection;
        EXPECT_NEAR(lat, c.lat, 1e-9) << c.projection;
        std::string name;
        ASSERT_EQ(GeoShortName(c.projection, name), 0) << c.projection;
        EXPECT_EQ(name, c.shortName);
    }
    double lon = 0, lat = 0;
    EXPECT_EQ(GeoProjectionOrigin("EPSG:4326", lon, lat), kGeoErrProjection);

    bool same = false;
    EXPECT_EQ(GeoIdentical("UTM-32", "EPSG:32632", same), 0);
    EXPECT_TRUE(same);
    GeoIdentical("UTM-32", "+proj=utm +zone=32 +datum=WGS84", same);
    EXPECT_TRUE(same);
    GeoIdentical("UTM-32  ", "UTM-33", same);
    EXPECT_FALSE(same);
    // Fixed-width fields: the text ends at its last non-blank or at a zero.
    GeoIdentical(std::string("long/lat\0junk", 13), "LONG/LAT    ", same);
    EXPECT_TRUE(same);
    EXPECT_EQ(GeoIdentical("UTM-32", "no such thing", same), kGeoErrProjection);
}

}  // namespace
