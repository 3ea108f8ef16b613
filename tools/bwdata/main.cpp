// bwdata: makes data files for bw from plain text and gets results out as text.
#include <algorithm>
#include <cerrno>
#include <climits>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <sstream>
#include <string>
#include <vector>

#include "bwdata/bwdata.hpp"
#include "bwdata/raster.hpp"
#include "bwdata/waves.hpp"
#include "data/xolfile.hpp"
#include "run/messages.hpp"

namespace {

const char* kUsage =
    "Usage:\n"
    "  bwdata info FILE\n"
    "  bwdata import-asc GRID.asc -o OUT.xol2 [--projection TEXT] [--origin LON,LAT]\n"
    "                    [--orientation DEG] [--name TEXT] [--type CODE] [--unit CODE] [--title "
    "TEXT]\n"
    "  bwdata import-csv SERIES.csv -o OUT.xol0 --start \"YYYY-MM-DD hh:mm:ss\"\n"
    "                    [--types C,...] [--units U,...] [--title TEXT]\n"
    "  bwdata import-csv LINE.csv -o OUT.xol1 --dx DX --start \"...\" [--type C] [--unit U] "
    "[--name TEXT]\n"
    "  bwdata import-raster RASTER -o OUT.xol2 [--band N] [--projection TEXT] [--origin LON,LAT]\n"
    "                    [--name TEXT] [--type CODE] [--unit CODE] [--title TEXT]\n"
    "  bwdata import-profile PROFILE.csv -o OUT.xol1 [--title TEXT]\n"
    "  bwdata export FILE -o OUT.csv|OUT.asc|OUT.tif [--item N] [--step N]\n"
    "  bwdata export FILE -o OUT.csv|OUT.asc|OUT.tif --static N\n"
    "  bwdata waves -o OUT.xol0|OUT.xol1 --drive level|flux|source --depth D --dt DT\n"
    "               --duration S --start \"...\" (--height H --period T | --hm0 H --tp T\n"
    "               [--gamma G] [--spreading S] [--band LOW,HIGH] [--components N] [--seed N])\n"
    "               [--side SIDE] [--direction DEG] [--ramp S] [--deep B] [--points N]\n"
    "               [--grid DX[,DY]] [--title TEXT]\n";

int Fail(const std::string& text) {
    std::fprintf(stderr, "bwdata: %s\n", text.c_str());
    return 1;
}

bool Integer(const std::string& text, int& out) {
    char* end = nullptr;
    errno = 0;
    const long v = std::strtol(text.c_str(), &end, 10);
    if (end == text.c_str() || *end != '\0' || errno != 0 || v < INT_MIN || v > INT_MAX)
        return false;
    out = static_cast<int>(v);
    return true;
}

bool Integers(const std::string& text, std::vector<int>& out) {
    std::istringstream in(text);
    std::string field;
    while (std::getline(in, field, ',')) {
        int v = 0;
        if (!Integer(field, v)) return false;
        out.push_back(v);
    }
    return !out.empty();
}

// The static items by the numbers that `export --static` takes (the summary
// lists the dynamic items only).
void PrintStaticItems(const XolFile& f) {
    for (size_t n = 0; n < f.staticItems.size(); ++n)
        std::printf("  Static item %zu: %s (%s)\n", n + 1, f.staticItems[n].name.c_str(),
                    f.staticItems[n].unitText.c_str());
}

// Longitude, latitude and orientation of a file, or "none" without a projection.
void PrintProjection(const XolFile& f) {
    if (f.projection.empty()) {
        std::printf("  Projection: none\n");
        return;
    }
    std::printf("  Projection: %s (longitude %s, latitude %s, orientation %s)\n",
                f.projection.c_str(), NumberText(f.longitude).c_str(),
                NumberText(f.latitude).c_str(), NumberText(f.orientation).c_str());
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 3 || std::strcmp(argv[1], "--help") == 0) {
        std::fputs(kUsage, argc < 2 ? stderr : stdout);
        return argc < 3 && !(argc == 2 && std::strcmp(argv[1], "--help") == 0) ? 2 : 0;
    }
    // Waves from H and T take options only, read by their own parser.
    if (std::strcmp(argv[1], "waves") == 0)
        return WavesCommand(std::vector<std::string>(argv + 2, argv + argc));
    const std::string command = argv[1], input = argv[2];
    if (command != "info" && command != "import-asc" && command != "import-csv" &&
        command != "import-raster" && command != "import-profile" && command != "export")
        return Fail("unknown command " + command + "\n" + kUsage);
    std::string output, start, text;
    AscOptions asc;
    CsvOptions csv;
    int item = 1, step = -1, staticItem = 0;
    bool dynamicChosen = false;  // --item or --step given
    RasterOptions raster;
    bool projectionGiven = false;
    for (int i = 3; i < argc; ++i) {
        const std::string arg = argv[i];
        if (i + 1 >= argc) return Fail("option " + arg + " needs a value");
        const std::string value = argv[++i];
        std::vector<int> codes;
        char* end = nullptr;
        if (arg == "-o")
            output = value;
        else if (arg == "--projection")
            asc.projection = value, projectionGiven = true;
        else if (arg == "--origin") {
            if (std::sscanf(value.c_str(), "%lf,%lf", &asc.longitude, &asc.latitude) != 2)
                return Fail("--origin needs LON,LAT");
            asc.originGiven = true;
        } else if (arg == "--orientation") {
            asc.orientation = std::strtod(value.c_str(), &end);
            if (end == value.c_str() || *end != '\0' || !std::isfinite(asc.orientation))
                return Fail("--orientation needs degrees");
            raster.orientationGiven = true;
        } else if (arg == "--name")
            asc.name = csv.name = value;
        else if (arg == "--title")
            asc.title = csv.title = value;
        else if (arg == "--type" || arg == "--types") {
            if (!Integers(value, codes)) return Fail(arg + " needs integer codes");
            asc.type = codes[0];
            csv.types = codes;
        } else if (arg == "--unit" || arg == "--units") {
            if (!Integers(value, codes)) return Fail(arg + " needs integer codes");
            asc.unit = codes[0];
            csv.units = codes;
        } else if (arg == "--start")
            csv.start = value;
        else if (arg == "--dx") {
            csv.line = true;
            csv.dx = std::strtof(value.c_str(), &end);
            if (end == value.c_str() || *end != '\0' || !(csv.dx > 0.0f) || std::isinf(csv.dx))
                return Fail("--dx needs a positive spacing");
        } else if (arg == "--item") {
            if (!Integer(value, item) || item < 1) return Fail("--item needs a number from 1");
            dynamicChosen = true;
        } else if (arg == "--step") {
            if (!Integer(value, step) || step < 0) return Fail("--step needs a number from 0");
            dynamicChosen = true;
        } else if (arg == "--band") {
            if (!Integer(value, raster.band) || raster.band < 1)
                return Fail("--band needs a number from 1");
        } else if (arg == "--static") {
            if (!Integer(value, staticItem) || staticItem < 1)
                return Fail("--static needs a number from 1");
        } else
            return Fail("unknown option " + arg);
    }
    if (command == "info") {
        int status = 0;
        XolFile f = XolOpenRead(input, &status);
        if (status != 0) return Fail(input + ": " + XolErrorText(status));
        // The range of every item over all steps, which a file read for a run leaves unknown.
        std::vector<float> values;
        for (int s = 0; s < f.noTimeSteps; ++s)
            for (XolItem& it : f.dynamicItems) {
                size_t points = 1;
                for (int d = 0; d < f.dimension; ++d)
                    points *= static_cast<size_t>(f.axes[d].count);
                values.resize(points);
                XolReadDynamic(f, values.data(), &status);
                if (status != 0) return Fail(input + ": " + XolErrorText(status));
                if (it.missing == kUnsetInteger) it.missing = 0;
                for (float v : values) {
                    if (v == f.deleteValue) {
                        ++it.missing;
                    } else if (it.minimum == kDeleteValue && it.maximum == kDeleteValue) {
                        it.minimum = it.maximum = v;
                    } else {
                        it.minimum = std::min<double>(it.minimum, v);
                        it.maximum = std::max<double>(it.maximum, v);
                    }
                }
            }
        XolPrintSummary(f);  // no log is open: the summary goes to standard output
        PrintStaticItems(f);
        PrintProjection(f);
        XolClose(f);
        return 0;
    }
    if (output.empty()) return Fail("-o OUTPUT is missing");
    if (command == "import-asc")
        text = ImportAsc(input, output, asc);
    else if (command == "import-raster") {
        raster.map = asc;
        if (!projectionGiven) raster.map.projection.clear();  // the raster's own CRS
        text = ImportRaster(input, output, raster);
    } else if (command == "import-profile") {
        text = ImportProfile(input, output, csv.title);
    } else if (command == "import-csv") {
        if (csv.start.empty()) return Fail("--start \"YYYY-MM-DD hh:mm:ss\" is missing");
        text = ImportCsv(input, output, csv);
    } else {
        if (staticItem > 0 && dynamicChosen)
            return Fail("--static exports a static item, which has no --item or --step");
        text = IsRasterOutput(output) ? ExportRaster(input, output, item, step, staticItem)
                                      : ExportText(input, output, item, step, staticItem);
    }
    if (!text.empty()) return Fail(text);
    std::printf("%s written\n", output.c_str());
    return 0;
}
