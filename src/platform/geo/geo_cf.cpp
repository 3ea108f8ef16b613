// The grid mapping of a data file in the terms of the CF conventions: the
// name of the projection method and its parameters, the ellipsoid, and the
// CRS as WKT, so that readers that know only CF attributes and readers that
// know only WKT place a map alike.
#include <cmath>
#include <cstring>

#include "platform/geo/geo.hpp"
#include "platform/geo/geo_internal.hpp"

namespace {

constexpr double kDegree = 3.14159265358979323846 / 180.0;

// A projection method by its EPSG code, its CF name, and the CF attribute
// each of its parameters (by EPSG code) goes to.
struct CfParameter {
    const char* epsg;
    const char* cf;
};
struct CfMethod {
    const char* epsg;
    const char* name;
    CfParameter parameters[6];
};

const CfMethod kMethods[] = {
    {"9807",
     "transverse_mercator",
     {{"8801", "latitude_of_projection_origin"},
      {"8802", "longitude_of_central_meridian"},
      {"8805", "scale_factor_at_central_meridian"},
      {"8806", "false_easting"},
      {"8807", "false_northing"}}},
    {"9802",
     "lambert_conformal_conic",
     {{"8821", "latitude_of_projection_origin"},
      {"8822", "longitude_of_central_meridian"},
      {"8823", "standard_parallel"},
      {"8824", "standard_parallel"},
      {"8826", "false_easting"},
      {"8827", "false_northing"}}},
    {"9801",
     "lambert_conformal_conic",
     {{"8801", "standard_parallel"},
      {"8801", "latitude_of_projection_origin"},
      {"8802", "longitude_of_central_meridian"},
      {"8805", "scale_factor_at_projection_origin"},
      {"8806", "false_easting"},
      {"8807", "false_northing"}}},
    {"9809",
     "oblique_stereographic",
     {{"8801", "latitude_of_projection_origin"},
      {"8802", "longitude_of_projection_origin"},
      {"8805", "scale_factor_at_projection_origin"},
      {"8806", "false_easting"},
      {"8807", "false_northing"}}},
    {"9804",
     "mercator",
     {{"8802", "longitude_of_projection_origin"},
      {"8805", "scale_factor_at_projection_origin"},
      {"8806", "false_easting"},
      {"8807", "false_northing"}}},
    {"9805",
     "mercator",
     {{"8823", "standard_parallel"},
      {"8802", "longitude_of_projection_origin"},
      {"8806", "false_easting"},
      {"8807", "false_northing"}}},
    {"9822",
     "albers_conical_equal_area",
     {{"8821", "latitude_of_projection_origin"},
      {"8822", "longitude_of_central_meridian"},
      {"8823", "standard_parallel"},
      {"8824", "standard_parallel"},
      {"8826", "false_easting"},
      {"8827", "false_northing"}}},
    {"9820",
     "lambert_azimuthal_equal_area",
     {{"8801", "latitude_of_projection_origin"},
      {"8802", "longitude_of_projection_origin"},
      {"8806", "false_easting"},
      {"8807", "false_northing"}}},
    {"9810",
     "polar_stereographic",
     {{"8801", "latitude_of_projection_origin"},
      {"8802", "straight_vertical_longitude_from_pole"},
      {"8805", "scale_factor_at_projection_origin"},
      {"8806", "false_easting"},
      {"8807", "false_northing"}}},
};

void AddNumber(std::vector<GeoCfAttribute>& attributes, const std::string& name, double value) {
    for (GeoCfAttribute& a : attributes)
        if (a.name == name) {
            a.values.push_back(value);
            return;
        }
    attributes.push_back(GeoCfAttribute{name, "", {value}});
}

void AddText(std::vector<GeoCfAttribute>& attributes, const std::string& name, const char* text) {
    if (text != nullptr && *text != '\0') attributes.push_back(GeoCfAttribute{name, text, {}});
}

// The method's CF name and parameters, angles in degrees and lengths in metres.
void AddMethod(PJ_CONTEXT* c, const PJ* projected, std::vector<GeoCfAttribute>& attributes) {
    PJ* conversion = proj_crs_get_coordoperation(c, projected);
    if (conversion == nullptr) return;
    const char* code = nullptr;
    proj_coordoperation_get_method_info(c, conversion, nullptr, nullptr, &code);
    const CfMethod* method = nullptr;
    for (const CfMethod& m : kMethods)
        if (code != nullptr && std::strcmp(code, m.epsg) == 0) method = &m;
    if (method != nullptr) {
        attributes.push_back(GeoCfAttribute{"grid_mapping_name", method->name, {}});
        const int count = proj_coordoperation_get_param_count(c, conversion);
        for (const CfParameter& p : method->parameters) {
            if (p.epsg == nullptr) break;
            for (int i = 0; i < count; ++i) {
                const char* paramCode = nullptr;
                const char* category = nullptr;
                double value = 0.0, factor = 1.0;
                proj_coordoperation_get_param(c, conversion, i, nullptr, nullptr, &paramCode,
                                              &value, nullptr, &factor, nullptr, nullptr, nullptr,
                                              &category);
                if (paramCode == nullptr || std::strcmp(paramCode, p.epsg) != 0) continue;
                const bool angle = category != nullptr && std::strcmp(category, "angular") == 0;
                AddNumber(attributes, p.cf, angle ? value * factor / kDegree : value * factor);
            }
        }
    }
    proj_destroy(conversion);
}

// The ellipsoid, prime meridian and the names of the datum and the CRSs.
void AddEarth(PJ_CONTEXT* c, const PJ* projected, std::vector<GeoCfAttribute>& attributes) {
    AddText(attributes, "projected_crs_name", proj_get_name(projected));
    PJ* geodetic = proj_crs_get_geodetic_crs(c, projected);
    if (geodetic == nullptr) return;
    AddText(attributes, "geographic_crs_name", proj_get_name(geodetic));
    if (PJ* datum = proj_crs_get_datum_forced(c, geodetic)) {
        AddText(attributes, "horizontal_datum_name", proj_get_name(datum));
        proj_destroy(datum);
    }
    if (PJ* ellipsoid = proj_get_ellipsoid(c, geodetic)) {
        double a = 0.0, b = 0.0, inverse = 0.0;
        int computed = 0;
        proj_ellipsoid_get_parameters(c, ellipsoid, &a, &b, &computed, &inverse);
        AddText(attributes, "reference_ellipsoid_name", proj_get_name(ellipsoid));
        AddNumber(attributes, "semi_major_axis", a);
        if (inverse > 0.0)
            AddNumber(attributes, "inverse_flattening", inverse);
        else
            AddNumber(attributes, "semi_minor_axis", b);
        proj_destroy(ellipsoid);
    }
    if (PJ* meridian = proj_get_prime_meridian(c, geodetic)) {
        double longitude = 0.0, factor = 1.0;
        proj_prime_meridian_get_parameters(c, meridian, &longitude, &factor, nullptr);
        AddText(attributes, "prime_meridian_name", proj_get_name(meridian));
        AddNumber(attributes, "longitude_of_prime_meridian", longitude * factor / kDegree);
        proj_destroy(meridian);
    }
    proj_destroy(geodetic);
}

}  // namespace

int GeoCfGridMapping(const std::string& projection, std::vector<GeoCfAttribute>& attributes) {
    attributes.clear();
    if (GeoIsNone(projection)) return 0;
    PJ_CONTEXT* c = GeoContext();
    PJ* crs = proj_create(c, GeoCrsText(projection).c_str());
    if (crs == nullptr) return kGeoErrProjection;
    PJ* projected = GeoHorizontal(crs);
    if (proj_get_type(projected) == PJ_TYPE_PROJECTED_CRS) {
        AddMethod(c, projected, attributes);
        AddEarth(c, projected, attributes);
    }
    // WKT 2 for CF; the older WKT for readers that know no other, where the
    // CRS has one (a CRS with a height has none).
    const char* const options[] = {"MULTILINE=NO", nullptr};
    AddText(attributes, "crs_wkt", proj_as_wkt(c, crs, PJ_WKT2_2019, options));
    const char* old = proj_as_wkt(c, crs, PJ_WKT1_GDAL, options);
    AddText(attributes, "spatial_ref",
            old != nullptr ? old : proj_as_wkt(c, crs, PJ_WKT2_2019, options));
    proj_destroy(projected);
    proj_destroy(crs);
    return 0;
}
