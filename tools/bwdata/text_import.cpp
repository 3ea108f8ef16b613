// Plain text into data files: ESRI ASCII grids into maps, CSV tables into
// series and line files. The whole input is read and checked before a file
// is written, so that bad input leaves nothing behind.
#include <cfloat>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>

#include "bwdata/bwdata.hpp"
#include "bwdata/raster.hpp"
#include "data/geoframe.hpp"
#include "data/xolfile.hpp"
#include "platform/geo/geo.hpp"
#include "platform/qty/qty.hpp"
#include "run/datetime.hpp"

namespace {

// A finite number and nothing else ("nan" and "inf" are no numbers here).
bool Number(const std::string& text, double& value) {
    const char* begin = text.c_str();
    while (*begin == ' ' || *begin == '\t') ++begin;
    char* end = nullptr;
    value = std::strtod(begin, &end);
    while (end && (*end == ' ' || *end == '\t' || *end == '\r')) ++end;
    return end != begin && end && *end == '\0' && std::isfinite(value);
}

// What is wrong with a value of a 32-bit file: empty when nothing.
std::string BadValue(const std::string& token, double& value) {
    if (!Number(token, value)) return "'" + token + "' is not a number";
    if (std::fabs(value) > FLT_MAX) return "'" + token + "' is too large for a 32-bit value";
    return "";
}

// The fields of a CSV row as RFC 4180 has them: a field in double quotes may
// hold the separator, and a doubled quote inside stands for one, as bwdata
// export writes gauge names ("P(3,4): Surface elevation").
std::vector<std::string> Split(const std::string& line, char separator) {
    std::vector<std::string> fields(1);
    bool quoted = false;
    for (size_t i = 0; i < line.size(); ++i) {
        const char c = line[i];
        if (quoted && c == '"' && i + 1 < line.size() && line[i + 1] == '"') {
            fields.back() += '"';
            ++i;
        } else if (c == '"' && (quoted || fields.back().empty())) {
            quoted = !quoted;
        } else if (c == separator && !quoted) {
            fields.emplace_back();
        } else {
            fields.back() += c;
        }
    }
    return fields;
}

std::string Trimmed(std::string text) {
    while (!text.empty() && (text.back() == '\r' || text.back() == ' ')) text.pop_back();
    size_t start = 0;
    while (start < text.size() && text[start] == ' ') ++start;
    return text.substr(start);
}

std::string Where(const std::string& file, int line) {
    return file + ":" + std::to_string(line) + ": ";
}

std::string CheckType(int type, int unit, const std::string& file) {
    std::string text;
    if (type != 999 && !qtyGetItemTypeKey(type, text))
        return file + ": unknown item type " + std::to_string(type);
    if (!qtyGetUnitKey(unit, text)) return file + ": unknown unit " + std::to_string(unit);
    if (!qtyItemUnitEqv(type, unit))
        return file + ": unit " + std::to_string(unit) + " does not fit item type " +
               std::to_string(type);
    return "";
}

// Writes a data file under a scratch name and renames it when complete.
template <typename Fill>
std::string WriteData(const std::string& output, Fill fill) {
    const std::string part = output + ".part";
    int status = 0;
    std::string error = fill(part, status);
    if (error.empty() && status != 0) error = output + ": " + XolErrorText(status);
    if (!error.empty()) {
        std::remove(part.c_str());
        return error;
    }
    if (std::rename(part.c_str(), output.c_str()) != 0) return output + ": can't be written";
    return "";
}

}  // namespace

bool WriteTextFile(const std::string& path, const std::string& text) {
    const std::string part = path + ".part";
    {
        std::ofstream out(part, std::ios::binary);
        out << text;
        if (!out) return false;
    }
    return std::rename(part.c_str(), path.c_str()) == 0;
}

std::string ImportAsc(const std::string& input, const std::string& output,
                      const AscOptions& options) {
    std::ifstream in(input);
    if (!in) return input + ": can't be opened";
    if (std::string e = CheckType(options.type, options.unit, input); !e.empty()) return e;
    long ncols = -1, nrows = -1;
    double x0 = 0, y0 = 0, cell = 0, nodata = NAN;
    bool centre = false, cellGiven = false;
    std::string line;
    int lineNo = 0;
    std::vector<float> rows;
    while (std::getline(in, line)) {
        ++lineNo;
        std::istringstream fields(line);
        std::string key;
        if (!(fields >> key)) continue;
        double value = 0;
        std::string lower = key;
        for (char& c : lower) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
        const bool headerKey = lower == "ncols" || lower == "nrows" || lower == "xllcorner" ||
                               lower == "xllcenter" || lower == "yllcorner" ||
                               lower == "yllcenter" || lower == "cellsize" ||
                               lower == "nodata_value";
        if (headerKey && !rows.empty())
            return Where(input, lineNo) + "the header key '" + key + "' comes after the data";
        if (headerKey) {
            std::string rest;
            fields >> rest;
            if (!Number(rest, value)) return Where(input, lineNo) + "'" + key + "' needs a number";
            if (lower == "ncols")
                ncols = std::lround(value);
            else if (lower == "nrows")
                nrows = std::lround(value);
            else if (lower == "xllcorner" || lower == "xllcenter")
                x0 = value, centre = lower == "xllcenter";
            else if (lower == "yllcorner" || lower == "yllcenter")
                y0 = value;
            else if (lower == "cellsize")
                cell = value, cellGiven = true;
            else
                nodata = value;
            continue;
        }
        if (rows.empty() && std::isalpha(static_cast<unsigned char>(key[0])))
            return Where(input, lineNo) + "unknown header key '" + key + "'";
        if (ncols <= 0 || nrows <= 0 || !cellGiven || cell <= 0)
            return Where(input, lineNo) + "the header needs ncols, nrows and a positive cellsize";
        if (static_cast<long>(rows.size()) == ncols * nrows)
            return Where(input, lineNo) + "more rows than nrows " + std::to_string(nrows);
        std::istringstream values(line);
        std::string token;
        long count = 0;
        while (values >> token) {
            if (std::string e = BadValue(token, value); !e.empty()) return Where(input, lineNo) + e;
            rows.push_back(value == nodata ? kDeleteValue : static_cast<float>(value));
            ++count;
        }
        if (count != ncols)
            return Where(input, lineNo) + "a row of " + std::to_string(count) + " values, not " +
                   std::to_string(ncols);
    }
    if (ncols <= 0 || nrows <= 0) return input + ": no grid header";
    if (static_cast<long>(rows.size()) != ncols * nrows)
        return input + ": " + std::to_string(rows.size() / ncols) + " rows, not " +
               std::to_string(nrows);

    // The first row is the northernmost: it becomes the row k = K.
    MapGrid grid;
    grid.columns = ncols;
    grid.rows = nrows;
    grid.cell = cell;
    grid.values.resize(rows.size());
    for (long k = 0; k < nrows; ++k)
        for (long j = 0; j < ncols; ++j)
            grid.values[k * ncols + j] = rows[(nrows - 1 - k) * ncols + j];
    const double half = centre ? 0.0 : 0.5 * cell;
    grid.x0 = x0 + half;
    grid.y0 = y0 + half;
    return WriteMapFile(grid, input, output, options);
}

std::string WriteMapFile(const MapGrid& grid, const std::string& input, const std::string& output,
                         const AscOptions& options) {
    if (std::string e = CheckType(options.type, options.unit, input); !e.empty()) return e;
    double lon = options.longitude, lat = options.latitude;
    double orientation = options.orientation;  // on no map: as given
    if (!GeoIsNone(options.projection)) {
        if (!options.originGiven) {
            // The geographic position of the lower-left cell centre.
            GeoHandle frame = 0;
            int status = 0;
            GeoFrameOpen(frame, options.projection, 0.0, 0.0, 0.0, &status);
            if (status != 0) return "unknown projection: " + options.projection;
            GeoFrameProj2Geo(frame, grid.x0, grid.y0, lon, lat, &status);
            GeoClose(frame);
            if (status != 0) return input + ": the grid's corner lies outside the projection";
        }
        // A file records the orientation from true north: the turn on the map
        // plus the meridian convergence at the origin.
        if (GeoOrientationOnMap(options.projection, lon, lat, options.orientation, orientation) !=
            0)
            return "unknown projection: " + options.projection;
    }
    return WriteData(output, [&](const std::string& part, int& status) -> std::string {
        XolFile f = XolCreateHeader(options.title.empty() ? options.name : options.title, 1, 2,
                                    {.appTitle = "bwdata"}, &status);
        if (status != 0) return "";
        XolSetItem(f, 1, options.type, options.name, options.unit, &status);
        XolSetAxis(f, 1, static_cast<float>(grid.cell), 0.0f, static_cast<int>(grid.columns));
        XolSetAxis(f, 2, static_cast<float>(grid.cell), 0.0f, static_cast<int>(grid.rows));
        XolSetProjection(f, options.projection, lon, lat, orientation);
        XolCreateFile(f, part, &status);
        if (status == 0) XolWriteDynamic(f, grid.values.data(), &status);
        XolClose(f);
        return "";
    });
}

std::string ImportCsv(const std::string& input, const std::string& output,
                      const CsvOptions& options) {
    std::ifstream in(input);
    if (!in) return input + ": can't be opened";
    DateTime start;
    if (!ParseDateTime(options.start, start))
        return "--start needs a date and time as \"YYYY-MM-DD hh:mm:ss\", not \"" + options.start +
               "\"";
    std::string line;
    int lineNo = 0;
    std::vector<std::string> names;
    std::vector<double> times;
    std::vector<float> values;
    size_t width = 0;
    while (std::getline(in, line)) {
        ++lineNo;
        line = Trimmed(line);
        if (line.empty()) continue;
        const auto fields = Split(line, ',');
        double t = 0;
        if (times.empty() && names.empty() && !Number(fields[0], t)) {
            for (size_t i = 1; i < fields.size(); ++i) {
                names.push_back(Trimmed(fields[i]));
                if (names.back().empty() && !options.line)
                    return Where(input, lineNo) + "item " + std::to_string(i) + " has no name";
            }
            continue;
        }
        if (!Number(fields[0], t))
            return Where(input, lineNo) + "the time '" + fields[0] + "' is not a number";
        if (width == 0) width = fields.size();
        if (fields.size() != width || width < 2)
            return Where(input, lineNo) + std::to_string(fields.size()) + " fields, not " +
                   std::to_string(width);
        for (size_t i = 1; i < fields.size(); ++i) {
            double v = 0;
            if (Trimmed(fields[i]).empty())
                v = kDeleteValue;
            else if (std::string e = BadValue(Trimmed(fields[i]), v); !e.empty())
                return Where(input, lineNo) + e;
            values.push_back(static_cast<float>(v));
        }
        times.push_back(t);
        if (times.size() == 1 && t != std::floor(t))
            return Where(input, lineNo) + "the first time " + Trimmed(fields[0]) +
                   " is not a whole second: a file starts on a whole second";
        if (times.size() == 2 && t <= times[0])
            return Where(input, lineNo) + "the time must grow from row to row";
        if (times.size() >= 3) {
            const double step = times[1] - times[0];
            const double gap = times.back() - times[times.size() - 2];
            if (std::fabs(gap - step) > 1e-6 * std::max(1.0, std::fabs(step)))
                return Where(input, lineNo) + "the time column is not equidistant";
        }
    }
    if (times.empty()) return input + ": no rows of values";
    const size_t items = width - 1;
    const double step = times.size() >= 2 ? times[1] - times[0] : 1.0;
    if (!options.line) {
        if (names.size() != items) return input + ": the header line must name every item";
        if ((!options.types.empty() && options.types.size() != items) ||
            (!options.units.empty() && options.units.size() != items))
            return "--types and --units need one code for each of the " + std::to_string(items) +
                   " items";
    }
    const size_t fileItems = options.line ? 1 : items;
    std::vector<int> types(fileItems,
                           options.line && !options.types.empty() ? options.types[0] : 999);
    std::vector<int> units(fileItems,
                           options.line && !options.units.empty() ? options.units[0] : 1000);
    if (!options.line) {
        if (!options.types.empty()) types = options.types;
        if (!options.units.empty()) units = options.units;
    }
    for (size_t i = 0; i < fileItems; ++i)
        if (std::string e = CheckType(types[i], units[i], input); !e.empty()) return e;

    const std::string first = DateTimeText(AddSeconds(start, times[0]));
    return WriteData(output, [&](const std::string& part, int& status) -> std::string {
        XolFile f = XolCreateHeader(options.title.empty() ? input : options.title,
                                    static_cast<int>(fileItems), options.line ? 1 : 0,
                                    {.appTitle = "bwdata"}, &status);
        if (status != 0) return "";
        for (size_t i = 0; i < fileItems; ++i)
            XolSetItem(f, static_cast<int>(i + 1), types[i], options.line ? options.name : names[i],
                       units[i], &status);
        if (options.line) XolSetAxis(f, 1, options.dx, 0.0f, static_cast<int>(items));
        XolSetCalendarAxis(f, step, first);
        XolCreateFile(f, part, &status);
        for (size_t s = 0; s < times.size() && status == 0; ++s) {
            if (options.line)
                XolWriteDynamic(f, &values[s * items], &status);
            else
                for (size_t i = 0; i < items && status == 0; ++i)
                    XolWriteDynamic(f, &values[s * items + i], &status);
        }
        XolClose(f);
        return "";
    });
}

std::string ImportProfile(const std::string& input, const std::string& output,
                          const std::string& title) {
    std::ifstream in(input);
    if (!in) return input + ": can't be opened";
    std::string line;
    int lineNo = 0;
    std::vector<float> x, z;
    while (std::getline(in, line)) {
        ++lineNo;
        line = Trimmed(line);
        if (line.empty()) continue;
        const auto fields = Split(line, ',');
        double a = 0.0, b = 0.0;
        if (x.empty() && !Number(fields[0], a)) continue;  // the header line
        if (fields.size() != 2)
            return Where(input, lineNo) + std::to_string(fields.size()) + " fields, not 2 (x, z)";
        if (std::string e = BadValue(Trimmed(fields[0]), a); !e.empty())
            return Where(input, lineNo) + e;
        if (std::string e = BadValue(Trimmed(fields[1]), b); !e.empty())
            return Where(input, lineNo) + e;
        if (!x.empty() && static_cast<float>(a) <= x.back())
            return Where(input, lineNo) + "x must rise from row to row";
        x.push_back(static_cast<float>(a));
        z.push_back(static_cast<float>(b));
    }
    if (x.size() < 2) return input + ": a profile needs at least two points";
    // Points dx apart to the precision of the file need no table of positions.
    const double dx = (static_cast<double>(x.back()) - x.front()) / (x.size() - 1);
    bool even = true;
    for (size_t i = 0; i < x.size() && even; ++i)
        even = std::fabs(x[i] - (x.front() + i * dx)) <= 1e-5 * std::max(1.0, std::fabs(dx * i));
    const int points = static_cast<int>(x.size());
    return WriteData(output, [&](const std::string& part, int& status) -> std::string {
        XolFile f = XolCreateHeader(title.empty() ? "Profile" : title, even ? 1 : 2, 1,
                                    {.appTitle = "bwdata"}, &status);
        if (status != 0) return "";
        int n = 1;
        if (!even) XolSetItem(f, n++, 999, "x", 1000, &status);
        XolSetItem(f, n, 100079, "Bathymetry", 1000, &status);
        XolSetAxis(f, 1, even ? static_cast<float>(dx) : 1.0f, even ? x.front() : 0.0f, points);
        XolCreateFile(f, part, &status);
        if (!even && status == 0) XolWriteDynamic(f, x.data(), &status);
        if (status == 0) XolWriteDynamic(f, z.data(), &status);
        XolClose(f);
        return "";
    });
}
