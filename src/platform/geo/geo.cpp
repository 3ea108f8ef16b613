#include "platform/geo/geo.hpp"

#include <proj.h>

#include <cctype>
#include <cmath>
#include <cstdlib>
#include <map>
#include <memory>

namespace {

constexpr double kDegree = 3.14159265358979323846 / 180.0;

struct Frame {
    std::string projection;
    bool none = false;
    PJ* crs = nullptr;         // the CRS as given (may carry a height or a datum shift)
    PJ* horizontal = nullptr;  // its projected part: the map projection itself
    PJ* transform = nullptr;   // geographic (lon, lat on WGS 84) to projected (east, north)
    PJ* toBase = nullptr;      // projected to lon, lat on the projection's own datum
    double longitude = 0.0, latitude = 0.0, orientation = 0.0;
    double east0 = 0.0, north0 = 0.0;  // the origin, projected
};

void Release(Frame& f) {
    for (PJ* p : {f.crs, f.horizontal, f.transform, f.toBase}) proj_destroy(p);
    f.crs = f.horizontal = f.transform = f.toBase = nullptr;
}

PJ_CONTEXT* Context() {
    static PJ_CONTEXT* context = [] {
        PJ_CONTEXT* c = proj_context_create();
        proj_log_level(c, PJ_LOG_NONE);
        return c;
    }();
    return context;
}

std::map<GeoHandle, std::unique_ptr<Frame>> gFrames;
GeoHandle gNext = 1;
std::string gError;

int Fail(int code, const std::string& text) {
    gError = text;
    return code;
}

Frame* Find(GeoHandle handle) {
    auto it = gFrames.find(handle);
    return it == gFrames.end() ? nullptr : it->second.get();
}

std::string Upper(std::string text) {
    for (char& c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    return text;
}

std::string Trimmed(const std::string& text) {
    const size_t end = text.find_last_not_of(" \t\r\n");
    return end == std::string::npos ? "" : text.substr(0, end + 1);
}

int Forward(const Frame& f, double lon, double lat, double& east, double& north) {
    if (f.none) {
        east = lon;
        north = lat;
        return 0;
    }
    PJ_COORD c = proj_coord(lon, lat, 0, 0);
    c = proj_trans(f.transform, PJ_FWD, c);
    if (!std::isfinite(c.xy.x) || !std::isfinite(c.xy.y))
        return Fail(kGeoErrTransform, "the point can't be projected");
    east = c.xy.x;
    north = c.xy.y;
    return 0;
}

int Inverse(const Frame& f, double east, double north, double& lon, double& lat) {
    if (f.none) {
        lon = east;
        lat = north;
        return 0;
    }
    PJ_COORD c = proj_coord(east, north, 0, 0);
    c = proj_trans(f.transform, PJ_INV, c);
    if (!std::isfinite(c.lp.lam) || !std::isfinite(c.lp.phi))
        return Fail(kGeoErrTransform, "the point can't be unprojected");
    lon = c.lp.lam;
    lat = c.lp.phi;
    return 0;
}

PJ* Normalized(PJ* operation) {
    PJ* normal = operation ? proj_normalize_for_visualization(Context(), operation) : nullptr;
    proj_destroy(operation);
    return normal;
}

// The CRS of the text, its projected part and the two transformations a frame
// needs. A grid in metres lies only on a map projection: a geographic CRS
// ("EPSG:4326") is refused, "LONG/LAT" being the way to say none.
int MakeProjection(Frame& f, const std::string& text) {
    f.crs = proj_create(Context(), text.c_str());
    if (f.crs == nullptr) return Fail(kGeoErrProjection, "unknown projection: " + text);
    PJ* h = proj_clone(Context(), f.crs);
    for (;;) {
        PJ* inner = nullptr;
        const PJ_TYPE type = proj_get_type(h);
        if (type == PJ_TYPE_BOUND_CRS)  // a CRS with its shift to WGS 84: the CRS itself
            inner = proj_get_source_crs(Context(), h);
        else if (type == PJ_TYPE_COMPOUND_CRS)  // horizontal plus height: the horizontal one
            inner = proj_crs_get_sub_crs(Context(), h, 0);
        if (inner == nullptr) break;
        proj_destroy(h);
        h = inner;
    }
    f.horizontal = h;
    const PJ_TYPE type = proj_get_type(h);
    if (type == PJ_TYPE_GEOGRAPHIC_2D_CRS || type == PJ_TYPE_GEOGRAPHIC_3D_CRS)
        return Fail(kGeoErrProjection, text + " is geographic, not a map projection");
    if (type != PJ_TYPE_PROJECTED_CRS)
        return Fail(kGeoErrProjection, text + " is not a map projection");
    PJ* wgs84 = proj_create(Context(), "EPSG:4326");
    f.transform =
        Normalized(proj_create_crs_to_crs_from_pj(Context(), wgs84, f.crs, nullptr, nullptr));
    proj_destroy(wgs84);
    PJ* base = proj_crs_get_geodetic_crs(Context(), h);
    f.toBase = Normalized(proj_create_crs_to_crs_from_pj(Context(), h, base, nullptr, nullptr));
    proj_destroy(base);
    if (f.transform == nullptr || f.toBase == nullptr)
        return Fail(kGeoErrProjection, "no transformation to " + text);
    return 0;
}

}  // namespace

bool GeoIsNone(const std::string& projection) {
    const std::string p = Upper(Trimmed(projection));
    return p == "NON-UTM" || p == "LONG/LAT";
}

std::string GeoCrsText(const std::string& projection) {
    const std::string p = Trimmed(projection);
    const std::string upper = Upper(p);
    if (upper.rfind("UTM-", 0) == 0) {
        char* end = nullptr;
        const long zone = std::strtol(p.c_str() + 4, &end, 10);
        if (end != p.c_str() + 4 && *end == '\0' && zone >= 1 && zone <= 60)
            return "EPSG:" + std::to_string(32600 + zone);
    }
    // A PROJ string without "+type=crs" would be read as a bare conversion,
    // which has no datum and no WKT of a CRS.
    if (p.rfind('+', 0) == 0 && p.find("+type=crs") == std::string::npos) return p + " +type=crs";
    return p;
}

const char* GeoLastError() {
    return gError.c_str();
}

int GeoOpen(GeoHandle* handle, const std::string& projection, double longitude, double latitude,
            double orientation) {
    *handle = 0;
    auto f = std::make_unique<Frame>();
    f->projection = Trimmed(projection);
    f->longitude = longitude;
    f->latitude = latitude;
    f->none = GeoIsNone(projection);
    f->orientation = f->none ? 0.0 : orientation;
    if (!f->none) {
        if (int code = MakeProjection(*f, GeoCrsText(projection))) {
            Release(*f);
            return code;
        }
    }
    if (int code = Forward(*f, longitude, latitude, f->east0, f->north0)) {
        Release(*f);
        return code;
    }
    *handle = gNext++;
    gFrames[*handle] = std::move(f);
    return 0;
}

void GeoClose(GeoHandle handle) {
    Frame* f = Find(handle);
    if (f == nullptr) return;
    Release(*f);
    gFrames.erase(handle);
}

int GeoGeo2Proj(GeoHandle h, double lon, double lat, double& east, double& north) {
    const Frame* f = Find(h);
    return f ? Forward(*f, lon, lat, east, north) : Fail(kGeoErrHandle, "not a frame");
}

int GeoProj2Geo(GeoHandle h, double east, double north, double& lon, double& lat) {
    const Frame* f = Find(h);
    return f ? Inverse(*f, east, north, lon, lat) : Fail(kGeoErrHandle, "not a frame");
}

int GeoXy2Proj(GeoHandle h, double x, double y, double& east, double& north) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    // The grid's y axis points orientation degrees clockwise from projection north.
    const double s = std::sin(f->orientation * kDegree), c = std::cos(f->orientation * kDegree);
    east = f->east0 + x * c + y * s;
    north = f->north0 - x * s + y * c;
    return 0;
}

int GeoProj2Xy(GeoHandle h, double east, double north, double& x, double& y) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    const double s = std::sin(f->orientation * kDegree), c = std::cos(f->orientation * kDegree);
    const double de = east - f->east0, dn = north - f->north0;
    x = de * c - dn * s;
    y = de * s + dn * c;
    return 0;
}

int GeoXy2Geo(GeoHandle h, double x, double y, double& lon, double& lat) {
    double east = 0, north = 0;
    if (int code = GeoXy2Proj(h, x, y, east, north)) return code;
    return GeoProj2Geo(h, east, north, lon, lat);
}

int GeoGeo2Xy(GeoHandle h, double lon, double lat, double& x, double& y) {
    double east = 0, north = 0;
    if (int code = GeoGeo2Proj(h, lon, lat, east, north)) return code;
    return GeoProj2Xy(h, east, north, x, y);
}

int GeoProjectionNorth(GeoHandle h, double& degrees) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    degrees = -f->orientation;
    return 0;
}

int GeoTrueNorth(GeoHandle h, double x, double y, double& degrees) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    double convergence = 0.0;
    if (!f->none) {
        double east = 0, north = 0;
        GeoXy2Proj(h, x, y, east, north);
        // The factors of a projection are taken at the point's longitude and
        // latitude on the projection's own datum, not on WGS 84.
        PJ_COORD c = proj_trans(f->toBase, PJ_FWD, proj_coord(east, north, 0, 0));
        if (!std::isfinite(c.lp.lam) || !std::isfinite(c.lp.phi))
            return Fail(kGeoErrTransform, "the point can't be unprojected");
        // PROJ's meridian convergence: the angle from true north to projection
        // north, positive where projection north lies east of true north.
        const PJ_FACTORS factors = proj_factors(
            f->horizontal, proj_coord(proj_torad(c.lp.lam), proj_torad(c.lp.phi), 0, 0));
        if (proj_errno(f->horizontal) != 0) {
            proj_errno_reset(f->horizontal);
            return Fail(kGeoErrTransform, "no meridian convergence at the point");
        }
        convergence = factors.meridian_convergence / kDegree;
    }
    degrees = -f->orientation - convergence;
    return 0;
}

int GeoProjectionString(GeoHandle h, std::string& text) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    text = f->projection;
    return 0;
}

int GeoProjectionName(GeoHandle h, std::string& name) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    // A CRS made from a PROJ string is called "unknown": its text says more.
    const char* n = f->none ? nullptr : proj_get_name(f->crs);
    name = n && std::string(n) != "unknown" ? n : f->projection;
    return 0;
}

int GeoCrsWkt(GeoHandle h, std::string& wkt) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    // On one line, so that a header dump of a data file stays readable.
    const char* const options[] = {"MULTILINE=NO", nullptr};
    const char* text = f->none ? nullptr : proj_as_wkt(Context(), f->crs, PJ_WKT2_2019, options);
    wkt = text ? text : "";
    return 0;
}

int GeoOrigin(GeoHandle h, double& lon, double& lat) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    lon = f->longitude;
    lat = f->latitude;
    return 0;
}

bool GeoIdentical(const std::string& a, const std::string& b) {
    if (GeoIsNone(a) || GeoIsNone(b)) return Upper(Trimmed(a)) == Upper(Trimmed(b));
    PJ* pa = proj_create(Context(), GeoCrsText(a).c_str());
    PJ* pb = proj_create(Context(), GeoCrsText(b).c_str());
    const bool same = pa && pb &&
                      proj_is_equivalent_to_with_ctx(Context(), pa, pb,
                                                     PJ_COMP_EQUIVALENT_EXCEPT_AXIS_ORDER_GEOGCRS);
    proj_destroy(pa);
    proj_destroy(pb);
    return same;
}
