// The map frame of the model: guarded calls of the cartography library. Each
// takes an optional status; without one, a failure stops the run with
// "Bad call to" and the routine's name, so that no caller has to test a
// result unless it wants to.
#pragma once

#include <string>

#include "platform/geo/geo.hpp"

// Without a status a refused projection stops the run with
// "Unable to establish projection: " and the text.
void GeoFrameOpen(GeoHandle& frame, const std::string& projection, double longitude,
                  double latitude, double orientation, int* status = nullptr);
// The origin of the projection itself (not of a frame's grid).
void GeoFrameGetOrigin(const std::string& projection, double& longitude, double& latitude,
                       int* status = nullptr);
void GeoFrameGeo2Proj(GeoHandle frame, double lon, double lat, double& east, double& north,
                      int* status = nullptr);
void GeoFrameProj2Geo(GeoHandle frame, double east, double north, double& lon, double& lat,
                      int* status = nullptr);
void GeoFrameXy2Geo(GeoHandle frame, double x, double y, double& lon, double& lat,
                    int* status = nullptr);
void GeoFrameGeo2xy(GeoHandle frame, double lon, double lat, double& x, double& y,
                    int* status = nullptr);
void GeoFrameXy2Proj(GeoHandle frame, double x, double y, double& east, double& north,
                     int* status = nullptr);
void GeoFrameProj2xy(GeoHandle frame, double east, double north, double& x, double& y,
                     int* status = nullptr);
void GeoFrameGetProjectionName(GeoHandle frame, std::string& name, int* status = nullptr);
void GeoFrameGetProjectionString(GeoHandle frame, std::string& text, int* status = nullptr);
void GeoFrameGetTrueNorth(GeoHandle frame, double x, double y, double& degrees,
                          int* status = nullptr);
void GeoFrameGetProjectionNorth(GeoHandle frame, double& degrees, int* status = nullptr);
void GeoFrameProjectionShortName(const std::string& projection, std::string& name,
                                 int* status = nullptr);
bool GeoFrameAreProjectionsIdentical(const std::string& a, const std::string& b,
                                     int* status = nullptr);
