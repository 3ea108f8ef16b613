#include "data/geoframe.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

namespace {

constexpr GeoHandle kNoFrame = 424242;

// Every guarded call stops the run with its own name when the library fails
// and no status is given; with a status it hands the code over and goes on.
TEST(GuardedMapFrame, EachCallStopsWithItsOwnName) {
    double a = 0, b = 0;
    std::string text;
    const std::vector<std::pair<std::string, std::function<void(int*)>>> calls = {
        {"GeoFrameGetOrigin", [&](int* s) { GeoFrameGetOrigin("EPSG:4326", a, b, s); }},
        {"GeoFrameGeo2Proj", [&](int* s) { GeoFrameGeo2Proj(kNoFrame, 0, 0, a, b, s); }},
        {"GeoFrameProj2Geo", [&](int* s) { GeoFrameProj2Geo(kNoFrame, 0, 0, a, b, s); }},
        {"GeoFrameXy2Geo", [&](int* s) { GeoFrameXy2Geo(kNoFrame, 0, 0, a, b, s); }},
        {"GeoFrameGeo2xy", [&](int* s) { GeoFrameGeo2xy(kNoFrame, 0, 0, a, b, s); }},
        {"GeoFrameXy2Proj", [&](int* s) { GeoFrameXy2Proj(kNoFrame, 0, 0, a, b, s); }},
        {"GeoFrameProj2xy", [&](int* s) { GeoFrameProj2xy(kNoFrame, 0, 0, a, b, s); }},
        {"GeoFrameGetProjectionName",
         [&](int* s) { GeoFrameGetProjectionName(kNoFrame, text, s); }},
        {"GeoFrameGetProjectionString",
         [&](int* s) { GeoFrameGetProjectionString(kNoFrame, text, s); }},
        {"GeoFrameGetTrueNorth", [&](int* s) { GeoFrameGetTrueNorth(kNoFrame, 0, 0, a, s); }},
        {"GeoFrameGetProjectionNorth", [&](int* s) { GeoFrameGetProjectionNorth(kNoFrame, a, s); }},
        {"GeoFrameProjectionShortName",
         [&](int* s) { GeoFrameProjectionShortName("no such thing", text, s); }},
        {"GeoFrameAreProjectionsIdentical",
         [&](int* s) { GeoFrameAreProjectionsIdentical("UTM-32", "no such thing", s); }},
    };
    for (const auto& [name, call] : calls) {
        int status = 0;
        call(&status);
        EXPECT_NE(status, 0) << name;
    }
    setenv("TRF", "HUD", 1);  // stop texts go to standard error, where the death test reads them
    for (const auto& [name, call] : calls)
        EXPECT_EXIT(call(nullptr), testing::ExitedWithCode(1), "Bad call to " + name + "\n");
    unsetenv("TRF");
}

// A point of the mesh side given in projected coordinates: the projection's
// own origin opens a frame, and the point comes back in longitude, latitude
// and the orientation of true north there.
TEST(GuardedMapFrame, APointOnTheMapFromTheProjectionsOrigin) {
    double lon = 0, lat = 0;
    GeoFrameGetOrigin("UTM-31", lon, lat);
    GeoHandle frame = 0;
    GeoFrameOpen(frame, "UTM-31", lon, lat, 0.0);
    double east = 0, north = 0;
    GeoFrameGeo2Proj(frame, lon, lat, east, north);
    EXPECT_NEAR(east, 500000.0, 1e-6);  // the central meridian on the equator
    EXPECT_NEAR(north, 0.0, 1e-6);
    double plon = 0, plat = 0, x = 0, y = 0, degrees = 0;
    GeoFrameProj2Geo(frame, 600000.0, 5800000.0, plon, plat);
    GeoFrameProj2xy(frame, 600000.0, 5800000.0, x, y);
    GeoFrameGetTrueNorth(frame, x, y, degrees);
    // East of the central meridian true north lies west of grid north.
    EXPECT_GT(plon, 3.0);
    EXPECT_LT(degrees, 0.0);
    EXPECT_GT(degrees, -2.0);
    std::string text;
    GeoFrameGetProjectionString(frame, text);
    int status = -1;
    GeoHandle again = 0;
    GeoFrameOpen(again, text, plon, plat, degrees, &status);  // the string opens a frame again
    EXPECT_EQ(status, 0);
    EXPECT_TRUE(GeoFrameAreProjectionsIdentical(text, "EPSG:32631"));
    GeoClose(again);
    GeoClose(frame);
}

}  // namespace
