#include "platform/qty/qty.hpp"

#include <algorithm>
#include <cctype>
#include <initializer_list>

namespace {

enum class Dimension {
    None,
    Length,
    PerLength,
    Time,
    Velocity,
    FluxPerWidth,
    Ratio,
    StressPerDensity
};

struct UnitRecord {
    int code;
    const char* key;  // the unit's text in data files and the log
    const char* cf;   // the CF/UDUNITS text
    Dimension dimension;
    double toBase;  // factor to the SI unit of the dimension
};

constexpr UnitRecord kUnits[] = {
    {kUnitNone, "", "", Dimension::None, 1.0},
    {1000, "meter", "m", Dimension::Length, 1.0},
    {1001, "kilometer", "km", Dimension::Length, 1000.0},
    {1002, "millimeter", "mm", Dimension::Length, 0.001},
    {1003, "feet", "ft", Dimension::Length, 0.3048},
    // The curvature of the surface that boundaries with the deep-water terms take.
    {1050, "1/meter", "m-1", Dimension::PerLength, 1.0},
    {1051, "1/feet", "ft-1", Dimension::PerLength, 1.0 / 0.3048},
    {1400, "sec", "s", Dimension::Time, 1.0},
    {1401, "minute", "min", Dimension::Time, 60.0},
    {1402, "hour", "h", Dimension::Time, 3600.0},
    {1403, "day", "d", Dimension::Time, 86400.0},
    {2000, "meter/sec", "m s-1", Dimension::Velocity, 1.0},
    {2001, "feet/sec", "ft s-1", Dimension::Velocity, 0.3048},
    {2002, "knot", "kt", Dimension::Velocity, 1852.0 / 3600.0},
    {4700, "m^3/s/m", "m2 s-1", Dimension::FluxPerWidth, 1.0},
    {4701, "ft^3/s/ft", "ft2 s-1", Dimension::FluxPerWidth, 0.3048 * 0.3048},
    // Radiation stress divided by the density of water.
    {5100, "m^3/s^2", "m3 s-2", Dimension::StressPerDensity, 1.0},
    {99000, "()", "1", Dimension::Ratio, 1.0},
    // The coefficients of the mesh solver's output (sponge, filter, auxiliary
    // variable); a file read back names them "1", as 99000.
    {5000, "coefficient", "1", Dimension::Ratio, 1.0},
};

struct TypeRecord {
    int code;
    const char* key;
    std::initializer_list<int> units;  // the first is the base unit
};

const TypeRecord kTypes[] = {
    {100000, "Water Level", {1000, 1003, 1002}},
    {100016, "Current Speed", {2000, 2001, 2002}},
    {100078, "Surface Elevation", {1000, 1003, 1002}},
    {100079, "Bathymetry", {1000, 1003}},
    {100080, "Flux (per unit width)", {4700, 4701}},
    {100097, "Significant Wave Height", {1000, 1003}},
    {100106, "Wave Height Ratio", {99000}},
    {100107, "Time", {1400, 1401, 1402, 1403}},
    {100109, "Radiation Stress", {5100}},
    {100280, "Water Depth", {1000, 1003}},
    {100294, "Wave Skewness", {99000}},
    {100296, "Wave Asymmetry", {99000}},
    {100297, "Wave Kurtosis", {99000}},
    {100298, "Coefficient", {5000, 99000}},
    {100299, "Roller Thickness", {1000, 1003}},
};

const UnitRecord* FindUnit(int code) {
    for (const auto& u : kUnits)
        if (u.code == code) return &u;
    return nullptr;
}

const TypeRecord* FindType(int code) {
    for (const auto& t : kTypes)
        if (t.code == code) return &t;
    return nullptr;
}

}  // namespace

bool qtyGetItemTypeKey(int type, std::string& text) {
    if (type == kTypeUndefined) {
        text = "Undefined";
        return true;
    }
    const TypeRecord* t = FindType(type);
    text = t ? t->key : "Unknown";
    return t != nullptr;
}

bool qtyGetUnitKey(int unit, std::string& text) {
    const UnitRecord* u = FindUnit(unit);
    text = u ? u->key : "Unknown";
    return u != nullptr;
}

bool qtyGetItemUnitSeq(int type, int seq, int& unit, std::string& text) {
    const TypeRecord* t = FindType(type);
    if (t == nullptr || seq < 1 || seq > static_cast<int>(t->units.size())) return false;
    unit = t->units.begin()[seq - 1];
    return qtyGetUnitKey(unit, text);
}

bool qtyGetItemUserUnit(int type, int& unit) {
    const TypeRecord* t = FindType(type);
    if (t == nullptr) return false;
    unit = *t->units.begin();
    return true;
}

bool qtyItemUnitEqv(int type, int unit) {
    if (type == kTypeUndefined) return FindUnit(unit) != nullptr;
    const TypeRecord* t = FindType(type);
    return t != nullptr && std::find(t->units.begin(), t->units.end(), unit) != t->units.end();
}

bool qtyConvertUnit(int fromUnit, int toUnit, double& value) {
    const UnitRecord* from = FindUnit(fromUnit);
    const UnitRecord* to = FindUnit(toUnit);
    if (from == nullptr || to == nullptr || from->dimension != to->dimension) return false;
    if (fromUnit != toUnit) value = value * from->toBase / to->toBase;
    return true;
}

std::string qtyGetCfUnit(int unit) {
    const UnitRecord* u = FindUnit(unit);
    return u ? u->cf : "";
}

int qtyUnitFromCf(const std::string& text) {
    std::string t;
    for (char c : text)
        if (!std::isspace(static_cast<unsigned char>(c)) || (!t.empty() && t.back() != ' '))
            t += c == '\t' ? ' ' : c;
    while (!t.empty() && t.back() == ' ') t.pop_back();
    // Spellings that UDUNITS takes for the same units.
    static const struct {
        const char* text;
        int unit;
    } kAliases[] = {{"meter", 1000},  {"meters", 1000},  {"metre", 1000}, {"metres", 1000},
                    {"second", 1400}, {"seconds", 1400}, {"sec", 1400},   {"m/s", 2000},
                    {"m.s-1", 2000},  {"m2/s", 4700},    {"m^2/s", 4700}, {"m3/s/m", 4700},
                    {"m2.s-1", 4700}, {"", 99000},       {"-", 99000}};
    for (const auto& u : kUnits)
        if (u.code != kUnitNone && t == u.cf) return u.code;
    for (const auto& a : kAliases)
        if (t == a.text) return a.unit;
    return -1;
}
