#include "data/geoframe.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

namespace {

constexpr GeoHandle kNoFrame = 424242;

// Every guarded call hands a failure's code over when given a status and
// goes on; without one it stops the run naming itself.
TEST(GuardedMapFrame, EachCallStopsWithItsOwnName) {
    double a = 0, b = 0;
    std::string text;
#define BW_CALL(f, ...)                        \
    {                                          \
#f, [&](int* s) { f(__VA_ARGS__, s); } \
    }
    const std::vector<std::pair<std::string, std::function<void(int*)>>> calls = {
        BW_CALL(GeoFrameGetOrigin, "EPSG:4326", a, b),
        BW_CALL(GeoFrameGeo2Proj, kNoFrame, 0, 0, a, b),
        BW_CALL(GeoFrameProj2Geo, kNoFrame, 0, 0, a, b),
        BW_CALL(GeoFrameXy2Geo, kNoFrame, 0, 0, a, b),
        BW_CALL(GeoFrameGeo2xy, kNoFrame, 0, 0, a, b),
        BW_CALL(GeoFrameXy2Proj, kNoFrame, 0, 0, a, b),
        BW_CALL(GeoFrameProj2xy, kNoFrame, 0, 0, a, b),
        BW_CALL(GeoFrameGetProjectionName, kNoFrame, text),
        BW_CALL(GeoFrameGetProjectionString, kNoFrame, text),
        BW_CALL(GeoFrameGetTrueNorth, kNoFrame, 0, 0, a),
        BW_CALL(GeoFrameGetProjectionNorth, kNoFrame, a),
        BW_CALL(GeoFrameProjectionShortName, "no such thing", text),
        BW_CALL(GeoFrameAreProjectionsIdentical, "UTM-32", "no such thing"),
    };
#undef BW_CALL
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

// A frame at the projection's origin: the origin maps to the false easting;
// east of the central meridian true north lies slightly west of grid north;
// the frame's projection text opens a frame again and matches its EPSG code.
TEST(GuardedMapFrame, APointOnTheMapFromTheProjectionsOrigin) {
    double lon = 0, lat = 0;
    GeoFrameGetOrigin("UTM-31", lon, lat);
    GeoHandle frame = 0;
    GeoFrameOpen(frame, "UTM-31", lon, lat, 0.0);
    double east = 0, north = 0;
    GeoFrameGeo2Proj(frame, lon, lat, east, north);
    EXPECT_NEAR(east, 500000.0, 1e-6);
    EXPECT_NEAR(north, 0.0, 1e-6);
    double plon = 0, plat = 0, x = 0, y = 0, degrees = 0;
    GeoFrameProj2Geo(frame, 600000.0, 5800000.0, plon, plat);
    GeoFrameProj2xy(frame, 600000.0, 5800000.0, x, y);
    GeoFrameGetTrueNorth(frame, x, y, degrees);
    EXPECT_GT(plon, 3.0);
    EXPECT_LT(degrees, 0.0);
    EXPECT_GT(degrees, -2.0);
    std::string text;
    GeoFrameGetProjectionString(frame, text);
    int status = -1;
    GeoHandle again = 0;
    GeoFrameOpen(again, text, plon, plat, degrees, &status);
    EXPECT_EQ(status, 0);
    EXPECT_TRUE(GeoFrameAreProjectionsIdentical(text, "EPSG:32631"));
    GeoClose(again);
    GeoClose(frame);
}

}  // namespace
