// Data files into plain text: series and lines as CSV, a map at one step (or a
// static map such as the bathymetry of a result file) as an ESRI ASCII grid or
// as the columns j,k,value.
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <sstream>

#include "bwdata/bwdata.hpp"
#include "data/geoframe.hpp"
#include "data/xolfile.hpp"
#include "platform/qty/qty.hpp"

namespace {

std::string Value(float v, float deleteValue) {
    if (v == deleteValue) return "";
    // The shortest text that reads back as the same 32-bit value.
    char text[32];
    for (int digits = 6; digits <= 9; ++digits) {
        std::snprintf(text, sizeof text, "%.*g", digits, static_cast<double>(v));
        if (std::strtof(text, nullptr) == v) break;
    }
    return text;
}

// A 64-bit value (a time, a coordinate) to the micro-unit, without trailing zeros.
std::string Fixed(double v) {
    char text[48];
    std::snprintf(text, sizeof text, "%.6f", v);
    std::string s = text;
    s.erase(s.find_last_not_of('0') + 1);
    if (s.back() == '.') s.pop_back();
    return s == "-0" ? "0" : s;
}

// Where the centre of the grid's lower-left cell lies on the map: the axis
// origins where the file has no place, else its first point, which lies at the
// file's longitude and latitude. An ASCII grid can't be turned, so a turned
// grid has no such place.
std::string LowerLeftCentre(const XolFile& f, double& x, double& y) {
    x = f.axes[0].origin;
    y = f.axes[1].origin;
    if (f.projection.empty()) return "";
    x = y = 0.0;
    GeoHandle frame = 0;
    int status = 0;
    GeoFrameOpen(frame, f.projection, f.longitude, f.latitude, f.orientation, &status);
    if (status != 0) return "the file's projection " + f.projection + " is not understood";
    double north = 0.0;
    GeoFrameGetProjectionNorth(frame, north, &status);
    if (north != 0.0) {
        GeoClose(frame);
        return "the grid is turned " + Fixed(-north) +
               " degrees on its map, which an ASCII grid can't hold: export it as .csv";
    }
    GeoFrameXy2Proj(frame, x, y, x, y, &status);
    GeoClose(frame);
    return status == 0 ? "" : "the grid's origin can't be placed on its map";
}

bool EndsWith(const std::string& text, const std::string& end) {
    return text.size() >= end.size() &&
           text.compare(text.size() - end.size(), end.size(), end) == 0;
}

// A CSV field as RFC 4180 has it: in double quotes, with each quote doubled,
// when it holds a separator, a quote or a line break ("P(3,4): Surface elevation").
std::string CsvField(const std::string& text) {
    if (text.find_first_of(",\"\r\n") == std::string::npos) return text;
    std::string quoted = "\"";
    for (char c : text) quoted += c == '"' ? std::string("\"\"") : std::string(1, c);
    return quoted + "\"";
}

// A map's values as an ESRI ASCII grid (.asc) or as the columns j,k,value (.csv).
std::string MapText(const XolFile& f, const std::vector<float>& values, const std::string& input,
                    const std::string& output, std::ostringstream& out) {
    const int nx = f.axes[0].count, ny = f.axes[1].count;
    if (EndsWith(output, ".asc")) {
        if (f.axes[0].spacing != f.axes[1].spacing)
            return input + ": an ASCII grid needs square cells, the file has dx " +
                   Value(f.axes[0].spacing, 1e30f) + " and dy " + Value(f.axes[1].spacing, 1e30f);
        double x0 = 0, y0 = 0;
        if (std::string e = LowerLeftCentre(f, x0, y0); !e.empty()) return input + ": " + e;
        out << "ncols " << nx << "\nnrows " << ny << "\nxllcenter " << Fixed(x0) << "\nyllcenter "
            << Fixed(y0) << "\ncellsize " << Value(f.axes[0].spacing, 1e30f)
            << "\nNODATA_value -9999\n";
        for (int k = ny - 1; k >= 0; --k) {  // the northernmost row first
            for (int j = 0; j < nx; ++j) {
                const float v = values[static_cast<size_t>(k) * nx + j];
                out << (j ? " " : "") << (v == f.deleteValue ? "-9999" : Value(v, 1e30f));
            }
            out << "\n";
        }
        return "";
    }
    if (!EndsWith(output, ".csv")) return output + ": a map is exported as .asc or .csv";
    out << "j,k,value\n";
    for (int k = 0; k < ny; ++k)
        for (int j = 0; j < nx; ++j)
            out << j << "," << k << ","
                << Value(values[static_cast<size_t>(k) * nx + j], f.deleteValue) << "\n";
    return "";
}

// The positions of a line's points, each after a comma: the header of its CSV
// after the time column.
std::string LineHeader(const XolFile& f, size_t points) {
    std::string text;
    for (size_t p = 0; p < points; ++p)
        text += "," + Value(f.axes[0].origin + static_cast<float>(p) * f.axes[0].spacing, 1e30f);
    return text;
}

// Static item `item` (from 1) of a map or a line: a map as for a step, a line
// as one row of values under the positions of its points.
std::string StaticText(XolFile& f, int item, std::vector<float>& values, const std::string& input,
                       const std::string& output, std::ostringstream& out) {
    if (item > f.noStaticItems) {
        std::string names;
        for (const XolItem& it : f.staticItems) names += (names.empty() ? ": " : ", ") + it.name;
        return input + ": there is no static item " + std::to_string(item) + " (the file has " +
               std::to_string(f.noStaticItems) + names + ")";
    }
    if (f.dimension == 0) return input + ": the static items of a series file are not exported";
    for (int n = 1; n <= item; ++n) {
        int status = 0;
        XolReadStatic(f, values.data(), &status);
        if (status != 0) return input + ": " + XolErrorText(status);
    }
    if (f.dimension == 2) return MapText(f, values, input, output, out);
    if (!EndsWith(output, ".csv")) return output + ": a line is exported as .csv";
    std::string row;
    for (float v : values) row += "," + Value(v, f.deleteValue);
    out << LineHeader(f, values.size()).substr(1) << "\n" << row.substr(1) << "\n";
    return "";
}

}  // namespace

std::string ExportText(const std::string& input, const std::string& output, int item, int step,
                       int staticItem) {
    int status = 0;
    XolFile f = XolOpenRead(input, &status);
    if (status != 0) return input + ": " + XolErrorText(status);
    const int items = f.noDynamicItems;
    const int steps = f.noTimeSteps;
    const size_t points = [&] {
        size_t n = 1;
        for (int d = 0; d < f.dimension; ++d) n *= static_cast<size_t>(f.axes[d].count);
        return n;
    }();
    if (f.dimension > 2) {
        XolClose(f);
        return input + ": files of more than two dimensions are not exported";
    }
    std::ostringstream out;
    std::vector<float> values(points);
    if (staticItem > 0) {
        const std::string e = StaticText(f, staticItem, values, input, output, out);
        XolClose(f);
        if (!e.empty()) return e;
        if (!WriteTextFile(output, out.str())) return output + ": can't be written";
        return "";
    }
    if (f.dimension > 0 && (item < 1 || item > items)) {
        XolClose(f);
        return input + ": there is no item " + std::to_string(item) + " (the file has " +
               std::to_string(items) + ")";
    }
    double seconds = f.timeStep;
    if (f.timeUnit != 1400 && !qtyConvertUnit(f.timeUnit, 1400, seconds)) {
        XolClose(f);
        return input + ": the time unit " + std::to_string(f.timeUnit) + " is not a time";
    }
    if (f.dimension < 2) {
        if (!EndsWith(output, ".csv")) {
            XolClose(f);
            return output + ": a series or line file is exported as .csv";
        }
        out << "time";
        if (f.dimension == 0) {
            for (const XolItem& it : f.dynamicItems) out << "," << CsvField(it.name);
        } else {
            out << LineHeader(f, points);
        }
        out << "\n";
        for (int s = 0; s < steps && status == 0; ++s) {
            out << Fixed(s * seconds);
            for (int n = 1; n <= items && status == 0; ++n) {
                const bool wanted = f.dimension == 0 || n == item;
                if (!wanted) {
                    XolSkipDynamic(f, &status);
                    continue;
                }
                XolReadDynamic(f, values.data(), &status);
                if (status != 0) break;
                for (size_t p = 0; p < points; ++p) out << "," << Value(values[p], f.deleteValue);
            }
            out << "\n";
        }
    } else {
        const int last = step < 0 ? steps - 1 : step;
        if (last < 0 || last >= steps) {
            XolClose(f);
            return input + ": there is no step " + std::to_string(step) + " (the file has " +
                   std::to_string(steps) + ")";
        }
        for (int s = 0; s <= last && status == 0; ++s)
            for (int n = 1; n <= items && status == 0; ++n) {
                if (s == last && n == item)
                    XolReadDynamic(f, values.data(), &status);
                else
                    XolSkipDynamic(f, &status);
            }
        if (status == 0) {
            if (std::string e = MapText(f, values, input, output, out); !e.empty()) {
                XolClose(f);
                return e;
            }
        }
    }
    XolClose(f);
    if (status != 0) return input + ": " + XolErrorText(status);
    if (!WriteTextFile(output, out.str())) return output + ": can't be written";
    return "";
}
