#include "data/geoframe.hpp"

#include "run/messages.hpp"

namespace {

// Hands the library's code to the status, or stops the run on a failure.
void Guard(int code, int* status, const char* routine) {
    if (status != nullptr)
        *status = code;
    else if (code != 0)
        StopRun(std::string("Bad call to ") + routine);
}

}  // namespace

void GeoFrameOpen(GeoHandle& frame, const std::string& projection, double longitude,
                  double latitude, double orientation, int* status) {
    const int code = GeoOpen(&frame, projection, longitude, latitude, orientation);
    if (status != nullptr)
        *status = code;
    else if (code != 0)
        StopRun("Unable to establish projection: " + std::string(TrimRight(projection)));
}

void GeoFrameGetOrigin(const std::string& projection, double& longitude, double& latitude,
                       int* status) {
    Guard(GeoProjectionOrigin(projection, longitude, latitude), status, "GeoFrameGetOrigin");
}

void GeoFrameGeo2Proj(GeoHandle frame, double lon, double lat, double& east, double& north,
                      int* status) {
    Guard(GeoGeo2Proj(frame, lon, lat, east, north), status, "GeoFrameGeo2Proj");
}

void GeoFrameProj2Geo(GeoHandle frame, double east, double north, double& lon, double& lat,
                      int* status) {
    Guard(GeoProj2Geo(frame, east, north, lon, lat), status, "GeoFrameProj2Geo");
}

void GeoFrameXy2Geo(GeoHandle frame, double x, double y, double& lon, double& lat, int* status) {
    Guard(GeoXy2Geo(frame, x, y, lon, lat), status, "GeoFrameXy2Geo");
}

void GeoFrameGeo2xy(GeoHandle frame, double lon, double lat, double& x, double& y, int* status) {
    Guard(GeoGeo2Xy(frame, lon, lat, x, y), status, "GeoFrameGeo2xy");
}

void GeoFrameXy2Proj(GeoHandle frame, double x, double y, double& east, double& north,
                     int* status) {
    Guard(GeoXy2Proj(frame, x, y, east, north), status, "GeoFrameXy2Proj");
}

void GeoFrameProj2xy(GeoHandle frame, double east, double north, double& x, double& y,
                     int* status) {
    Guard(GeoProj2Xy(frame, east, north, x, y), status, "GeoFrameProj2xy");
}

void GeoFrameGetProjectionName(GeoHandle frame, std::string& name, int* status) {
    Guard(GeoProjectionName(frame, name), status, "GeoFrameGetProjectionName");
}

void GeoFrameGetProjectionString(GeoHandle frame, std::string& text, int* status) {
    Guard(GeoProjectionString(frame, text), status, "GeoFrameGetProjectionString");
}

void GeoFrameGetTrueNorth(GeoHandle frame, double x, double y, double& degrees, int* status) {
    Guard(GeoTrueNorth(frame, x, y, degrees), status, "GeoFrameGetTrueNorth");
}

void GeoFrameGetProjectionNorth(GeoHandle frame, double& degrees, int* status) {
    Guard(GeoProjectionNorth(frame, degrees), status, "GeoFrameGetProjectionNorth");
}

void GeoFrameProjectionShortName(const std::string& projection, std::string& name, int* status) {
    Guard(GeoShortName(projection, name), status, "GeoFrameProjectionShortName");
}

bool GeoFrameAreProjectionsIdentical(const std::string& a, const std::string& b, int* status) {
    bool same = false;
    Guard(GeoIdentical(a, b, same), status, "GeoFrameAreProjectionsIdentical");
    return same;
}
