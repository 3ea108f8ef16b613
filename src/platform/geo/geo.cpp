#include "platform/geo/geo.hpp"

#include <proj.h>

#include <cctype>
#include <cmath>
#include <cstdlib>
#include <map>
#include <memory>

#include "platform/geo/geo_internal.hpp"

namespace {

constexpr double kDegree = 3.14159265358979323846 / 180.0;

struct Frame {
    std::string projection;
    bool none = false;
    PJ* crs = nullptr;         // the CRS as given (may carry a height or a datum shift)
    PJ* horizontal = nullptr;  // its projected part: the map projection itself
    PJ* transform = nullptr;   // geographic (lon, lat on WGS 84) to projected (east, north)
    PJ* toBase = nullptr;      // projected to lon, lat on the projection's own datum
    double longitude = 0.0, latitude = 0.0;
    double orientation = 0.0;  // degrees clockwise from projection north to the grid's y axis
    double east0 = 0.0, north0 = 0.0;  // the origin, projected
};

// A turn of the grid on its map below this many degrees is round-off of the
// meridian convergence (0.2 mm over 100 km), and the grid lies unturned.
constexpr double kNoTurn = 1e-7;

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

// A text as the library takes it: cut at a terminating zero, without trailing blanks.
std::string Trimmed(const std::string& field) {
    const std::string text = field.substr(0, field.find('\0'));
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

PJ* Horizontal(const PJ* crs) {
    PJ* h = proj_clone(Context(), crs);
    for (;;) {
        PJ* inner = nullptr;
        const PJ_TYPE type = proj_get_type(h);
        if (type == PJ_TYPE_BOUND_CRS)
            inner = proj_get_source_crs(Context(), h);
        else if (type == PJ_TYPE_COMPOUND_CRS)
            inner = proj_crs_get_sub_crs(Context(), h, 0);
        if (inner == nullptr) return h;
        proj_destroy(h);
        h = inner;
    }
}

// A CRS made from a projection text, or nullptr with the failure noted.
PJ* CreateCrs(const std::string& projection) {
    const std::string text = GeoCrsText(projection);
    PJ* crs = proj_create(Context(), text.c_str());
    if (crs == nullptr) Fail(kGeoErrProjection, "unknown projection: " + text);
    return crs;
}

// The CRS of the text, its projected part and the two transformations a frame
// needs. A grid in metres lies only on a map projection: a geographic CRS
// ("EPSG:4326") is refused, "LONG/LAT" being the way to say none.
int MakeProjection(Frame& f, const std::string& text) {
    f.crs = CreateCrs(text);
    if (f.crs == nullptr) return kGeoErrProjection;
    PJ* h = Horizontal(f.crs);
    // Easting first, whatever order the CRS's definition gives its axes: the
    // factors of the projection read the point and give the meridian
    // convergence in that order (a northing-first CRS would otherwise turn
    // true north by the better part of a right angle).
    if (PJ* ordered = proj_normalize_for_visualization(Context(), h)) {
        proj_destroy(h);
        h = ordered;
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

// PROJ's meridian convergence at a projected point, in degrees: the angle
// from true north to projection north, positive where projection north lies
// east of true north. The factors of a projection are taken at the point's
// longitude and latitude on the projection's own datum, not on WGS 84.
int Convergence(const Frame& f, double east, double north, double& degrees) {
    PJ_COORD c = proj_trans(f.toBase, PJ_FWD, proj_coord(east, north, 0, 0));
    if (!std::isfinite(c.lp.lam) || !std::isfinite(c.lp.phi))
        return Fail(kGeoErrTransform, "the point can't be unprojected");
    const PJ_FACTORS factors =
        proj_factors(f.horizontal, proj_coord(proj_torad(c.lp.lam), proj_torad(c.lp.phi), 0, 0));
    if (proj_errno(f.horizontal) != 0) {
        proj_errno_reset(f.horizontal);
        return Fail(kGeoErrTransform, "no meridian convergence at the point");
    }
    degrees = factors.meridian_convergence / kDegree;
    return 0;
}

}  // namespace

PJ_CONTEXT* GeoContext() {
    return Context();
}

PJ* GeoHorizontal(const PJ* crs) {
    return Horizontal(crs);
}

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
    if (!f->none) {
        if (int code = MakeProjection(*f, f->projection)) {
            Release(*f);
            return code;
        }
    }
    if (int code = Forward(*f, longitude, latitude, f->east0, f->north0)) {
        Release(*f);
        return code;
    }
    if (!f->none) {
        // The orientation given is from true north; the grid turns on its map
        // by that less the meridian convergence at its origin.
        double convergence = 0.0;
        if (int code = Convergence(*f, f->east0, f->north0, convergence)) {
            Release(*f);
            return code;
        }
        f->orientation = orientation - convergence;
        if (std::fabs(f->orientation) < kNoTurn) f->orientation = 0.0;
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
        if (int code = Convergence(*f, east, north, convergence)) return code;
    }
    degrees = f->orientation + convergence;
    return 0;
}

int GeoOrientationOnMap(const std::string& projection, double longitude, double latitude,
                        double turn, double& orientation) {
    orientation = 0.0;
    GeoHandle h = 0;
    if (int code = GeoOpen(&h, projection, longitude, latitude, 0.0)) return code;
    const Frame* f = Find(h);
    orientation = f->none ? 0.0 : turn - f->orientation;  // the frame turned by -convergence
    GeoClose(h);
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

int GeoProjectionOrigin(const std::string& projection, double& lon, double& lat) {
    lon = lat = 0.0;  // also where a projection names no origin: PROJ's defaults
    if (GeoIsNone(projection)) return 0;
    PJ* crs = CreateCrs(projection);
    if (crs == nullptr) return kGeoErrProjection;
    PJ* h = Horizontal(crs);
    proj_destroy(crs);
    int code = 0;
    if (proj_get_type(h) != PJ_TYPE_PROJECTED_CRS) {
        code = Fail(kGeoErrProjection, Trimmed(projection) + " is not a map projection");
    } else {
        // The longitude and latitude of the natural origin, the false origin or
        // the projection centre, whichever the method has (EPSG parameter codes).
        PJ* op = proj_crs_get_coordoperation(Context(), h);
        const int count = op ? proj_coordoperation_get_param_count(Context(), op) : 0;
        for (int i = 0; i < count; ++i) {
            const char* authority = nullptr;
            const char* id = nullptr;
            double value = 0.0, toRadians = 1.0;
            if (!proj_coordoperation_get_param(Context(), op, i, nullptr, &authority, &id, &value,
                                               nullptr, &toRadians, nullptr, nullptr, nullptr,
                                               nullptr) ||
                authority == nullptr || id == nullptr || std::string(authority) != "EPSG")
                continue;
            const int parameter = std::atoi(id);
            const double degrees = value * toRadians / kDegree;
            if (parameter == 8802 || parameter == 8822 || parameter == 8812 || parameter == 8833)
                lon = degrees;
            else if (parameter == 8801 || parameter == 8821 || parameter == 8811)
                lat = degrees;
        }
        proj_destroy(op);
    }
    proj_destroy(h);
    return code;
}

int GeoShortName(const std::string& projection, std::string& name) {
    const std::string p = Trimmed(projection);
    if (GeoIsNone(p)) {
        name = Upper(p);
        return 0;
    }
    PJ* crs = CreateCrs(p);
    if (crs == nullptr) return kGeoErrProjection;
    // The authority code the CRS carries, or the one PROJ finds it identical to.
    std::string authority, code;
    auto take = [&](const PJ* object) {
        const char* a = proj_get_id_auth_name(object, 0);
        const char* c = proj_get_id_code(object, 0);
        if (a == nullptr || c == nullptr) return false;
        authority = a;
        code = c;
        return true;
    };
    if (!take(crs)) {
        int* confidence = nullptr;
        PJ_OBJ_LIST* found = proj_identify(Context(), crs, "EPSG", nullptr, &confidence);
        // 70: equivalent under another name, such as any CRS made from a PROJ string.
        if (found != nullptr && proj_list_get_count(found) > 0 && confidence[0] >= 70) {
            // A match may carry no code (a CRS with a datum shift to WGS 84).
            PJ* match = proj_list_get(Context(), found, 0);
            take(match);
            proj_destroy(match);
        }
        proj_int_list_destroy(confidence);
        proj_list_destroy(found);
    }
    const long number = std::strtol(code.c_str(), nullptr, 10);
    if (authority == "EPSG" && number > 32600 && number <= 32660)
        name = "UTM-" + std::to_string(number - 32600);  // our own form of a northern UTM zone
    else if (!authority.empty())
        name = authority + ":" + code;
    else if (const char* n = proj_get_name(crs); n && std::string(n) != "unknown")
        name = n;
    else
        name = p;
    proj_destroy(crs);
    return 0;
}

int GeoIdentical(const std::string& a, const std::string& b, bool& same) {
    same = false;
    if (GeoIsNone(a) || GeoIsNone(b)) {
        same = Upper(Trimmed(a)) == Upper(Trimmed(b));
        return 0;
    }
    PJ* pa = CreateCrs(a);
    PJ* pb = pa ? CreateCrs(b) : nullptr;
    if (pa && pb)
        same = proj_is_equivalent_to_with_ctx(Context(), pa, pb,
                                              PJ_COMP_EQUIVALENT_EXCEPT_AXIS_ORDER_GEOGCRS);
    const int code = pa && pb ? 0 : kGeoErrProjection;
    proj_destroy(pa);
    proj_destroy(pb);
    return code;
}
