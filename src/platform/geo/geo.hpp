// Map projection of the model grid, on PROJ.
//
// Three kinds of coordinates: geographic (longitude, latitude in degrees),
// projected (easting, northing in metres of a map projection) and model
// (x, y in metres on the grid, whose origin lies at a given geographic point
// and whose y axis is turned `orientation` degrees clockwise from projection
// north). The projection is "UTM-<zone>" (northern hemisphere), any text of a
// projected CRS that PROJ accepts ("EPSG:32632", a PROJ string, WKT, also with
// a height or a datum shift), or "NON-UTM" / "LONG/LAT": no map projection,
// where coordinates pass unchanged and the orientation is 0. Geographic
// coordinates are on WGS 84.
#pragma once

#include <cstdint>
#include <string>

using GeoHandle = uint64_t;

constexpr int kGeoErrProjection = 1;  // the projection text is not understood
constexpr int kGeoErrHandle = 2;      // not a live frame
constexpr int kGeoErrTransform = 3;   // a point PROJ could not transform

// Texts given to these calls end at the last non-blank or at a terminating zero.

// True for the two texts that mean "no map projection".
bool GeoIsNone(const std::string& projection);
// The text PROJ is given for a projection ("UTM-32" becomes "EPSG:32632").
std::string GeoCrsText(const std::string& projection);

// Makes a frame; 0 on success.
int GeoOpen(GeoHandle* frame, const std::string& projection, double longitude, double latitude,
            double orientation);
void GeoClose(GeoHandle frame);
const char* GeoLastError();

int GeoGeo2Proj(GeoHandle frame, double lon, double lat, double& east, double& north);
int GeoProj2Geo(GeoHandle frame, double east, double north, double& lon, double& lat);
int GeoXy2Proj(GeoHandle frame, double x, double y, double& east, double& north);
int GeoProj2Xy(GeoHandle frame, double east, double north, double& x, double& y);
int GeoXy2Geo(GeoHandle frame, double x, double y, double& lon, double& lat);
int GeoGeo2Xy(GeoHandle frame, double lon, double lat, double& x, double& y);
// Degrees clockwise from the grid's y axis to true north at a model point:
// the meridian convergence of the projection on its own datum.
int GeoTrueNorth(GeoHandle frame, double x, double y, double& degrees);
// Degrees clockwise from the grid's y axis to projection north.
int GeoProjectionNorth(GeoHandle frame, double& degrees);
int GeoProjectionString(GeoHandle frame, std::string& text);
// The CRS's own name ("WGS 84 / UTM zone 32N"), or the text for no projection.
int GeoProjectionName(GeoHandle frame, std::string& name);
// The CRS as WKT on one line (empty for no projection), for the grid mapping of data files.
int GeoCrsWkt(GeoHandle frame, std::string& wkt);
// The origin given to the frame: the geographic position of model point (0, 0).
int GeoOrigin(GeoHandle frame, double& lon, double& lat);

// Calls on a projection text alone, without a frame.
// The projection's own origin (longitude and latitude of its natural origin,
// false origin or centre); 0, 0 for no projection.
int GeoProjectionOrigin(const std::string& projection, double& lon, double& lat);
// A short name: "UTM-<zone>" for a northern UTM zone on WGS 84, else the
// authority code ("EPSG:28992") the CRS has or is identical to, else its name.
int GeoShortName(const std::string& projection, std::string& name);
// Whether two projection texts stand for the same CRS; a text PROJ refuses is a failure.
int GeoIdentical(const std::string& a, const std::string& b, bool& same);
