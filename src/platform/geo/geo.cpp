#include "platform/geo/geo.hpp"

#include <proj.h>

#include <cctype>
#include <cmath>
#include <map>
#include <memory>

namespace {

constexpr double kDegree = 3.14159265358979323846 / 180.0;

struct Frame {
    std::string projection;
    bool none = false;
    PJ* transform = nullptr;  // geographic (lon, lat) to projected (east, north)
    PJ* crs = nullptr;
    double longitude = 0.0, latitude = 0.0, orientation = 0.0;
    double east0 = 0.0, north0 = 0.0;  // the origin, projected
};

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
        const std::string crs = GeoCrsText(projection);
        f->crs = proj_create(Context(), crs.c_str());
        if (f->crs == nullptr) return Fail(kGeoErrProjection, "unknown projection: " + crs);
        PJ* raw = proj_create_crs_to_crs(Context(), "EPSG:4326", crs.c_str(), nullptr);
        f->transform = raw ? proj_normalize_for_visualization(Context(), raw) : nullptr;
        proj_destroy(raw);
        if (f->transform == nullptr) {
            proj_destroy(f->crs);
            return Fail(kGeoErrProjection, "no transformation to " + crs);
        }
    }
    if (int code = Forward(*f, longitude, latitude, f->east0, f->north0)) {
        proj_destroy(f->transform);
        proj_destroy(f->crs);
        return code;
    }
    *handle = gNext++;
    gFrames[*handle] = std::move(f);
    return 0;
}

void GeoClose(GeoHandle handle) {
    Frame* f = Find(handle);
    if (f == nullptr) return;
    proj_destroy(f->transform);
    proj_destroy(f->crs);
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
        double lon = 0, lat = 0;
        if (int code = GeoXy2Geo(h, x, y, lon, lat)) return code;
        // PROJ's meridian convergence: the angle from true north to projection
        // north, positive where projection north lies east of true north.
        PJ_COORD c = proj_coord(proj_torad(lon), proj_torad(lat), 0, 0);
        const PJ_FACTORS factors = proj_factors(f->crs, c);
        if (proj_errno(f->crs) != 0) {
            proj_errno_reset(f->crs);
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
    const char* n = f->none ? nullptr : proj_get_name(f->crs);
    name = n ? n : f->projection;
    return 0;
}

int GeoCrsWkt(GeoHandle h, std::string& wkt) {
    const Frame* f = Find(h);
    if (f == nullptr) return Fail(kGeoErrHandle, "not a frame");
    const char* text = f->none ? nullptr : proj_as_wkt(Context(), f->crs, PJ_WKT2_2019, nullptr);
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
    const bool same = pa && pb && proj_is_equivalent_to(pa, pb, PJ_COMP_EQUIVALENT);
    proj_destroy(pa);
    proj_destroy(pb);
    return same;
}
