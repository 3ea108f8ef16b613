// The map frame. Where a number is PROJ's to know (a projected point, the
// direction of a meridian on the map) it is checked against the cs2cs
// program of the PROJ tools; model coordinates against the grid's turn.
#include "platform/geo/geo.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <iomanip>
#include <sstream>
#include <utility>
#include <vector>

#include "support/test_support.hpp"

namespace {

using Points = std::vector<std::pair<double, double>>;

// Transforms points with cs2cs ("<from> <to>" or "<from> +to <to>"), the two
// coordinates of each in the order its CRS wants them.
Points Cs2cs(const std::string& crsPair, const Points& in) {
    std::ostringstream input;
    input << std::fixed << std::setprecision(10);
    for (const auto& [a, b] : in) input << a << " " << b << "\n";
    const auto r = bwtest::RunProgramWithInput({"/bin/sh", "-c", "cs2cs -f %.6f " + crsPair}, ".",
                                               input.str());
    Points out;
    std::istringstream lines(r.out);
    double a = 0, b = 0;
    for (std::string line; r.exitCode == 0 && std::getline(lines, line);)
        if (std::istringstream(line) >> a >> b) out.emplace_back(a, b);
    return out;
}

// For each kind of projection, at points left and right of the origin: the
// point projected from WGS 84 as cs2cs does it, and back to within a
// millimetre; true north there (on the projection's own datum) against a step
// north and south projected by cs2cs, less the grid's orientation. Then the
// WKT a data file gets (of a CRS, never of a bare conversion) and the origin.
constexpr const char* kLcc =
    "+proj=lcc +lat_0=52 +lon_0=10 +lat_1=35 +lat_2=65 +x_0=4000000 +y_0=2800000 +ellps=GRS80 "
    "+type=crs";

TEST(MapFrame, ProjectionsAgreeWithTheProjTools) {
    const struct {
        const char* projection;
        const char* crs;   // the CRS for cs2cs and that of its geographic
        const char* base;  // CRS (latitude first for an EPSG code)
        double lon, lat, orientation;
        const char* wkt;
        double originLon, originLat;
        const char* horizontal = nullptr;  // the projected part, when not crs
    } cases[] = {
        {"UTM-32", "EPSG:32632", "EPSG:4326", 9.5, 54.25, 30.0, "PROJCRS", 9.0, 0.0},
        {"EPSG:28992", "EPSG:28992", "EPSG:4289", 4.9, 52.37, 0.0, "PROJCRS", 5.38763888888889,
         52.1561605555556},  // oblique stereographic on its own datum
        {"EPSG:25832+5783", "EPSG:25832", "EPSG:4258", 8.0, 50.0, 0.0, "COMPOUNDCRS", 9.0, 0.0},
        {"+proj=utm +zone=32 +ellps=intl +towgs84=-87,-98,-121",
         "+proj=utm +zone=32 +ellps=intl +towgs84=-87,-98,-121 +type=crs",
         "+proj=longlat +ellps=intl +type=crs", 10.0, 56.0, 5.0, "BOUNDCRS", 9.0, 0.0,
         "+proj=utm +zone=32 +ellps=intl +type=crs"},
        // A CRS whose definition gives the northing first (Lambert conic of
        // Europe); cs2cs gets the same projection easting first.
        {"EPSG:3034", kLcc, "EPSG:4258", 12.0, 52.0, 0.0, "PROJCRS", 10.0, 52.0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.projection);
        const bool latFirst = std::string(c.base).rfind("EPSG:", 0) == 0;
        GeoHandle frame = 0;
        ASSERT_EQ(GeoOpen(&frame, c.projection, c.lon, c.lat, c.orientation), 0) << GeoLastError();
        const double lons[] = {c.lon - 1.5, c.lon + 2.0};
        const Points projected =
            Cs2cs(std::string("EPSG:4326 +to ") + c.crs, {{c.lat, lons[0]}, {c.lat, lons[1]}});
        ASSERT_EQ(projected.size(), 2u);
        for (int k = 0; k < 2; ++k) {
            double east = 0, north = 0, lon = 0, lat = 0, x = 0, y = 0, degrees = 0;
            ASSERT_EQ(GeoGeo2Proj(frame, lons[k], c.lat, east, north), 0);
            EXPECT_NEAR(east, projected[k].first, 1e-5);
            EXPECT_NEAR(north, projected[k].second, 1e-5);
            ASSERT_EQ(GeoProj2Geo(frame, east, north, lon, lat), 0);
            const double metres =
                std::hypot((lon - lons[k]) * std::cos(c.lat * M_PI / 180), lat - c.lat) * 111e3;
            EXPECT_LT(metres, 1e-3) << lon << " " << lat;

            Points steps;
            for (double dlat : {0.0, 1e-3, -1e-3})
                steps.push_back(latFirst ? std::make_pair(c.lat + dlat, lons[k])
                                         : std::make_pair(lons[k], c.lat + dlat));
            const Points p =
                Cs2cs(std::string(c.base) + " +to " + (c.horizontal ? c.horizontal : c.crs), steps);
            ASSERT_EQ(p.size(), 3u);
            const double meridian =
                std::atan2(p[1].first - p[2].first, p[1].second - p[2].second) * 180.0 / M_PI;
            GeoProj2Xy(frame, p[0].first, p[0].second, x, y);
            // The grid's y axis from true north: its turn on the map less the
            // direction of true north on the map.
            double turnedNorth = 0.0;
            GeoProjectionNorth(frame, turnedNorth);
            ASSERT_EQ(GeoTrueNorth(frame, x, y, degrees), 0);
            EXPECT_NEAR(degrees, -turnedNorth - meridian, 1e-6) << "at " << lons[k];
        }
        std::string wkt;
        GeoCrsWkt(frame, wkt);
        EXPECT_EQ(wkt.substr(0, wkt.find('[')), c.wkt) << wkt.substr(0, 40);
        GeoClose(frame);
        double lon = -1, lat = -1;
        ASSERT_EQ(GeoProjectionOrigin(c.projection, lon, lat), 0);
        EXPECT_NEAR(lon, c.originLon, 1e-9);
        EXPECT_NEAR(lat, c.originLat, 1e-9);
    }
}

// Model coordinates: (0, 0) is the origin given, and the grid's y axis points
// `orientation` clockwise from projection north; without a projection
// coordinates pass unchanged and the orientation is 0.
TEST(MapFrame, ModelCoordinatesTurnWithTheGrid) {
    const struct {
        const char* projection;
        double lon, lat, orientation, turn, east0;
    } cases[] = {{"UTM-32", 9.0, 54.25, 30.0, 30.0, 500000.0},
                 {"NON-UTM", 1000.0, 2000.0, 45.0, 0.0, 1000.0}};
    for (const auto& c : cases) {
        SCOPED_TRACE(c.projection);
        GeoHandle frame = 0;
        ASSERT_EQ(GeoOpen(&frame, c.projection, c.lon, c.lat, c.orientation), 0);
        double lon = 0, lat = 0, e0 = 0, n0 = 0, e = 0, n = 0, north = 0;
        GeoXy2Geo(frame, 0.0, 0.0, lon, lat);
        EXPECT_NEAR(lon, c.lon, 1e-12);
        EXPECT_NEAR(lat, c.lat, 1e-12);
        GeoXy2Proj(frame, 0.0, 0.0, e0, n0);
        EXPECT_NEAR(e0, c.east0, 1e-6);  // on the central meridian of its zone
        const double sin = std::sin(c.turn * M_PI / 180), cos = std::cos(c.turn * M_PI / 180);
        for (const auto& [dx, dy] : {std::pair{0.0, 100.0}, {100.0, 0.0}}) {
            GeoXy2Proj(frame, dx, dy, e, n);
            EXPECT_NEAR(e - e0, dx * cos + dy * sin, 1e-9) << dx;
            EXPECT_NEAR(n - n0, dy * cos - dx * sin, 1e-9) << dx;
        }
        GeoProjectionNorth(frame, north);
        EXPECT_NEAR(north, -c.turn, 1e-12);
        GeoClose(frame);
    }
}

// A grid unturned on its map, 1.5 degrees east of the zone's central meridian:
// the orientation its files record is the meridian convergence there, its
// frame lies exactly unturned on the map, and a file written for a part of
// the grid (origin and true north at that part's corner) opens again exactly
// unturned and at the same place. A turn of 10 degrees on the map is kept.
TEST(MapFrame, AGridOnItsMapStaysUnturnedThroughFiles) {
    for (double turn : {0.0, 10.0}) {
        SCOPED_TRACE(turn);
        double orientation = 0.0;
        ASSERT_EQ(GeoOrientationOnMap("UTM-32", 10.5, 54.0, turn, orientation), 0);
        EXPECT_NEAR(orientation - turn, 1.2136, 1e-3);  // sin(54 deg) * 1.5 deg, about
        GeoHandle frame = 0, part = 0;
        ASSERT_EQ(GeoOpen(&frame, "UTM-32", 10.5, 54.0, orientation), 0);
        double north = -1.0, degrees = 0.0;
        GeoProjectionNorth(frame, north);
        EXPECT_EQ(north, -turn);
        GeoTrueNorth(frame, 0.0, 0.0, degrees);
        EXPECT_NEAR(degrees, orientation, 1e-12);

        double lon = 0, lat = 0, east = 0, northing = 0, e = 0, n = 0;
        GeoXy2Geo(frame, 3000.0, 2000.0, lon, lat);
        GeoTrueNorth(frame, 3000.0, 2000.0, degrees);
        GeoXy2Proj(frame, 3000.0, 2000.0, east, northing);
        ASSERT_EQ(GeoOpen(&part, "UTM-32", lon, lat, degrees), 0);
        GeoProjectionNorth(part, north);
        if (turn == 0.0)
            EXPECT_EQ(north, 0.0);
        else
            EXPECT_NEAR(north, -turn, 1e-9);
        GeoXy2Proj(part, 0.0, 0.0, e, n);
        EXPECT_NEAR(e, east, 1e-6);
        EXPECT_NEAR(n, northing, 1e-6);
        GeoClose(part);
        GeoClose(frame);
    }
    double none = -1.0;
    ASSERT_EQ(GeoOrientationOnMap("NON-UTM", 0.0, 0.0, 30.0, none), 0);
    EXPECT_EQ(none, 0.0);
}

// Texts that name no map projection are refused. A short name is
// "UTM-<zone>" for a northern UTM zone on WGS 84, else the EPSG code the CRS
// has or is identical to. Two texts are compared as CRSs, blanks and a
// terminating zero aside.
TEST(MapFrame, RefusedTextsShortNamesAndComparedTexts) {
    GeoHandle frame = 0;
    // A grid in metres can't lie on longitude and latitude under a CRS's name.
    for (const char* text : {"UTM-61", "EPSG:4326"})
        EXPECT_EQ(GeoOpen(&frame, text, 0, 0, 0), kGeoErrProjection) << text;
    const std::pair<const char*, const char*> names[] = {
        {"+proj=tmerc +lon_0=3 +k=0.9996 +x_0=500000 +datum=WGS84", "UTM-31"},
        {"EPSG:28992", "EPSG:28992"},
        {"EPSG:25832+5783", "EPSG:5555"},  // with a height: the code of the pair
        {"long/lat", "LONG/LAT"},
        // Like ED50 / UTM 32 but with its own datum shift: a CRS without a code.
        {"+proj=utm +zone=32 +ellps=intl +towgs84=-87,-98,-121",
         "+proj=utm +zone=32 +ellps=intl +towgs84=-87,-98,-121"},
    };
    for (const auto& [text, expected] : names) {
        std::string name;
        EXPECT_EQ(GeoShortName(text, name), 0) << text;
        EXPECT_EQ(name, expected) << text;
    }
    const struct {
        std::string a, b;
        bool same;
    } pairs[] = {
        {"UTM-32", "+proj=utm +zone=32 +datum=WGS84", true},
        {"UTM-32  ", "UTM-33", false},
        {std::string("long/lat\0junk", 13), "LONG/LAT    ", true},  // fixed-width fields
        {"NON-UTM", "LONG/LAT", false},
    };
    for (const auto& p : pairs) {
        bool same = !p.same;
        EXPECT_EQ(GeoIdentical(p.a, p.b, same), 0) << p.a;
        EXPECT_EQ(same, p.same) << p.a << " and " << p.b;
    }
}

}  // namespace
