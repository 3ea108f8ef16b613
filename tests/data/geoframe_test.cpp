#include "data/geoframe.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

namespace {

constexpr GeoHandle kNoFrame = 424242;

// Every guarded call hands a failure's code over when given a status and
// goes on; without one it stops the run naming itself. On a frame at the
// projection's origin the calls the output makes give the library's answer:
// east of the central meridian the grid's y axis lies slightly east of true north,
// and the frame's projection text matches its EPSG code.
TEST(GuardedMapFrame, EachCallStopsWithItsOwnNameOrGivesTheLibrarysAnswer) {
    GeoHandle frame = 0;
    GeoFrameOpen(frame, "UTM-31", 3.0, 0.0, 0.0);
    double a = 0, b = 0;
    GeoFrameGetTrueNorth(frame, 100000.0, 5800000.0, a);
    EXPECT_TRUE(a > 0.0 && a < 2.0) << a;
    std::string text;
    GeoFrameGetProjectionString(frame, text);
    EXPECT_TRUE(GeoFrameAreProjectionsIdentical(text, "EPSG:32631"));
    GeoClose(frame);
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

}  // namespace
