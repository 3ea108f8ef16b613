// Map projection of the model grid, on PROJ.
//
// Three kinds of coordinates: geographic (longitude, latitude in degrees),
// projected (easting, northing in metres of a map projection) and model
// (x, y in metres on the grid, whose origin lies at a given geographic point
// and whose y axis is turned `orientation` degrees clockwise from true north
// there). A data file records that orientation: a grid that lies unturned on
// its map has the meridian convergence of its origin as orientation, which
// GeoOrientationOnMap gives. The projection is "UTM-<zone>" (northern hemisphere), any text of a
// projected CRS that PROJ accepts ("EPSG:32632", a PROJ string, WKT, also with
// a height or a datum shift), or "NON-UTM" / "LONG/LAT": no map projection,
// where coordinates pass unchanged and the orientation is 0. Geographic
// coordinates are on WGS 84.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

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
// Degrees clockwise from true north to the grid's y axis at a model point
// (the meridian convergence of the projection taken on its own datum): the
// orientation a data file records for a grid whose origin lies there.
int GeoTrueNorth(GeoHandle frame, double x, double y, double& degrees);
// Degrees clockwise from the grid's y axis to projection north: exactly 0 for
// a grid that lies unturned on its map (a turn below 1e-7 degrees is taken as
// round-off).
int GeoProjectionNorth(GeoHandle frame, double& degrees);
// The orientation (from true north) of a grid whose origin lies at longitude,
// latitude and whose y axis is turned `turn` degrees clockwise from the
// projection's north: what a file made from a map grid records. 0 for no projection.
int GeoOrientationOnMap(const std::string& projection, double longitude, double latitude,
                        double turn, double& orientation);
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
// An attribute of a grid-mapping variable: a text, or numbers.
struct GeoCfAttribute {
    std::string name;
    std::string text;
    std::vector<double> values;
};
// The grid mapping of a projection as CF has it: grid_mapping_name and the
// parameters of the method (for the methods CF names), the ellipsoid and the
// names of the datum and CRSs, crs_wkt (WKT 2) and spatial_ref (the older WKT
// where the CRS has one). Empty for no projection.
int GeoCfGridMapping(const std::string& projection, std::vector<GeoCfAttribute>& attributes);
// Whether two projection texts stand for the same CRS; a text PROJ refuses is a failure.
int GeoIdentical(const std::string& a, const std::string& b, bool& same);
