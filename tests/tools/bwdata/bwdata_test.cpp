// The bwdata tool as a user runs it: import, look, export.
#include <gtest/gtest.h>

#include <filesystem>
#include <tuple>

#include "data/xolfile.hpp"
#include "support/test_support.hpp"
#include "tools/bwdata/tool_fixture.hpp"

namespace fs = std::filesystem;

namespace {

testing::AssertionResult Has(const std::string& text, const std::string& part) {
    if (text.find(part) != std::string::npos) return testing::AssertionSuccess();
    return testing::AssertionFailure() << "no \"" << part << "\" in:\n" << text;
}

// A grid comes back as it went in, holes included; its rows run south to north
// in the long form.
TEST_F(DataTool, GridRoundTripKeepsTheNumbersAndTheRows) {
    const std::string grid =
        "ncols 3\nnrows 2\nxllcenter 0\nyllcenter 0\ncellsize 2.5\n"
        "NODATA_value -9999\n1.25 2 3\n4 -9999 -6.5\n";
    bwtest::WriteFile(dir / "bay.asc", grid);
    Ok({"import-asc", "bay.asc", "-o", "bay.xol2"});
    EXPECT_TRUE(Has(Run({"info", "bay.xol2"}).out,
                    "  Bathymetry           Bathymetry                 -6.5          4"
                    "       1 meter"));
    Ok({"export", "bay.xol2", "-o", "back.asc"});
    EXPECT_EQ(bwtest::ReadFile(dir / "back.asc"), grid);
    Ok({"export", "bay.xol2", "-o", "long.csv"});
    // Row k = 0 is the southernmost: the last row of the grid text.
    EXPECT_EQ(bwtest::ReadFile(dir / "long.csv"),
              "j,k,value\n0,0,4\n1,0,\n2,0,-6.5\n0,1,1.25\n1,1,2\n2,1,3\n");
}

// On a real projection the origin is the lower-left cell centre on the map.
TEST_F(DataTool, ARealProjectionPlacesTheOriginAtTheLowerLeftCell) {
    bwtest::WriteFile(dir / "utm.asc",
                      "ncols 2\nnrows 2\nxllcorner 499990\nyllcorner 5999990\n"
                      "cellsize 20\n1 2\n3 4\n");
    Ok({"import-asc", "utm.asc", "-o", "utm.xol2", "--projection", "UTM-32"});
    // The lower-left cell centre, easting 500000, lies on the zone's central meridian, 9° east.
    EXPECT_TRUE(Has(Run({"info", "utm.xol2"}).out, "(longitude 9, latitude 54.14"));
    // Back on the map where it came from, as cell centres.
    Ok({"export", "utm.xol2", "-o", "back.asc"});
    EXPECT_EQ(bwtest::ReadFile(dir / "back.asc"),
              "ncols 2\nnrows 2\nxllcenter 500000\nyllcenter 6000000\ncellsize 20\n"
              "NODATA_value -9999\n1 2\n3 4\n");
    // A grid turned on its map has no ASCII grid form.
    Ok({"import-asc", "utm.asc", "-o", "turned.xol2", "--projection", "EPSG:32632", "--orientation",
        "20"});
    auto turned = Run({"export", "turned.xol2", "-o", "turned.asc"});
    EXPECT_EQ(turned.exitCode, 1);
    EXPECT_TRUE(Has(turned.err, "turned 20 degrees"));
    EXPECT_FALSE(fs::exists(dir / "turned.asc"));
}

// Series (an empty value kept empty) and lines come back as they went in.
TEST_F(DataTool, SeriesAndLinesRoundTrip) {
    const std::string series = "time,Level,Flux\n0,0.5,1\n2,0.6,1.5\n4,0.7,\n";
    bwtest::WriteFile(dir / "s.csv", series);
    Ok({"import-csv", "s.csv", "-o", "s.xol0", "--start", "2004-01-01 00:00:00", "--types",
        "100078,100080", "--units", "1000,4700"});
    Ok({"export", "s.xol0", "-o", "back.csv"});
    EXPECT_EQ(bwtest::ReadFile(dir / "back.csv"), series);

    bwtest::WriteFile(dir / "l.csv", "0,1,2,3\n0.5,4,5,6\n");
    Ok({"import-csv", "l.csv", "-o", "l.xol1", "--dx", "5", "--start", "2004-01-01 00:00:00"});
    Ok({"export", "l.xol1", "-o", "l2.csv"});
    EXPECT_EQ(bwtest::ReadFile(dir / "l2.csv"), "time,0,5,10\n0,1,2,3\n0.5,4,5,6\n");
}

// A result file as the engine writes one: items `names` over `dimension` axes
// of 3 x 2 points, two steps of values 10 n + s + i / 4, then the static items
// `statics` of values -(s + 1) - i (s counting from 0), the first on the delete value
// at point 1.
std::string WriteResult(const bwtest::TempDir& dir, const std::string& name, int dimension,
                        const std::vector<std::string>& names,
                        const std::vector<std::string>& statics) {
    const std::string path = dir / name;
    const int items = static_cast<int>(names.size());
    XolFile f = XolCreateHeader("Result", items, dimension, {.appTitle = "bw"});
    for (int n = 1; n <= items; ++n) XolSetItem(f, n, 100078, names[n - 1], 1000);
    if (dimension > 0) XolSetAxis(f, 1, 2.0f, 10.0f, 3);
    if (dimension > 1) XolSetAxis(f, 2, 2.0f, 20.0f, 2);
    XolSetCalendarAxis(f, 0.5, "2026-01-01 12:00:00");
    XolCreateFile(f, path);
    const size_t points = dimension == 0 ? 1 : dimension == 1 ? 3 : 6;
    std::vector<float> values(points);
    for (size_t s = 0; s < statics.size(); ++s) {
        for (size_t i = 0; i < points; ++i) values[i] = -1.0f - s - i;
        if (s == 0 && points > 1) values[1] = kDeleteValue;
        XolWriteStatic(f, values.data(), 100079, statics[s], 1000);
    }
    for (int s = 0; s < 2; ++s)
        for (int n = 1; n <= items; ++n) {
            for (size_t i = 0; i < points; ++i) values[i] = 10.0f * n + s + 0.25f * i;
            XolWriteDynamic(f, values.data());
        }
    XolClose(f);
    return path;
}

// Gauge names hold commas and quotes ("P(3,4): Surface elevation"): such a
// header field is quoted, quotes doubled, so that every row has as many
// fields as the header; a plain name stays as it is. import-csv reads such a
// file back with the same names.
TEST_F(DataTool, SeriesHeaderQuotesNamesWithCommasAndQuotes) {
    WriteResult(dir, "gauges.xol0", 0, {"P(3,4): Surface elevation", "Say \"high\"", "Level"}, {});
    Ok({"export", "gauges.xol0", "-o", "gauges.csv"});
    const std::string csv =
        "time,\"P(3,4): Surface elevation\",\"Say \"\"high\"\"\",Level\n"
        "0,10,20,30\n0.5,11,21,31\n";
    EXPECT_EQ(bwtest::ReadFile(dir / "gauges.csv"), csv);
    Ok({"import-csv", "gauges.csv", "-o", "back.xol0", "--start", "2026-01-01 12:00:00"});
    Ok({"export", "back.xol0", "-o", "back.csv"});
    EXPECT_EQ(bwtest::ReadFile(dir / "back.csv"), csv);
}

// The static items of a result file (the bathymetry of a map) are exported by
// their number: a map as a grid or as columns, a line as one row; info lists
// them by that number.
TEST_F(DataTool, StaticItemsAreExportedByTheirNumber) {
    WriteResult(dir, "map.xol2", 2, {"Surface elevation"}, {"Bathymetry", "Porosity"});
    EXPECT_TRUE(Has(Run({"info", "map.xol2"}).out,
                    "  Static item 1: Bathymetry (meter)\n  Static item 2: Porosity (meter)\n"));
    Ok({"export", "map.xol2", "-o", "bed.asc", "--static", "1"});
    EXPECT_EQ(bwtest::ReadFile(dir / "bed.asc"),
              "ncols 3\nnrows 2\nxllcenter 10\nyllcenter 20\ncellsize 2\nNODATA_value -9999\n"
              "-4 -5 -6\n-1 -9999 -3\n");
    Ok({"export", "map.xol2", "-o", "porosity.csv", "--static", "2"});
    EXPECT_EQ(bwtest::ReadFile(dir / "porosity.csv"),
              "j,k,value\n0,0,-2\n1,0,-3\n2,0,-4\n0,1,-5\n1,1,-6\n2,1,-7\n");
    // The dynamic item is still what export gives by default.
    Ok({"export", "map.xol2", "-o", "last.csv"});
    EXPECT_TRUE(Has(bwtest::ReadFile(dir / "last.csv"), "j,k,value\n0,0,11\n1,0,11.25\n"));

    WriteResult(dir, "axis.xol1", 1, {"Surface elevation"}, {"Bathymetry"});
    Ok({"export", "axis.xol1", "-o", "axis.csv", "--static", "1"});
    EXPECT_EQ(bwtest::ReadFile(dir / "axis.csv"), "10,12,14\n-1,,-3\n");

    const std::tuple<std::vector<std::string>, const char*> refusals[] = {
        {{"map.xol2", "--static", "3"},
         "there is no static item 3 (the file has 2: Bathymetry, "
         "Porosity)"},
        {{"map.xol2", "--static", "1", "--step", "0"}, "--static exports a static item"},
        {{"map.xol2", "--static", "0"}, "--static needs a number from 1"},
    };
    for (const auto& [args, message] : refusals) {
        std::vector<std::string> all = {"export"};
        all.insert(all.end(), args.begin(), args.end());
        all.insert(all.end(), {"-o", "out.csv"});
        const auto r = Run(all);
        EXPECT_EQ(r.exitCode, 1) << args[2];
        EXPECT_TRUE(Has(r.err, message));
        EXPECT_FALSE(fs::exists(dir / "out.csv"));
    }
}

// Bad input is named by file and line, and no output is left, not even a part.
TEST_F(DataTool, BadInputIsNamedAndWritesNothing) {
    const std::string corner = "xllcorner 0\nyllcorner 0\ncellsize 1\n";
    const std::tuple<std::string, std::string, const char*> cases[] = {
        {"ragged.asc", "ncols 3\nnrows 2\n" + corner + "1 2 3\n4 5\n",
         "ragged.asc:7: a row of 2 values, not 3"},
        {"word.asc", "ncols 2\nnrows 1\n" + corner + "1 deep\n",
         "word.asc:6: 'deep' is not a number"},
        {"long.asc", "ncols 2\nnrows 1\n" + corner + "1 2\n3 4\n",
         "long.asc:7: more rows than nrows 1"},
        {"nan.csv", "time,a\n0,1\n1,nan\n", "nan.csv:3: 'nan' is not a number"},
        {"uneven.csv", "time,a\n0,1\n1,2\n3,3\n",
         "uneven.csv:4: the time column is not equidistant"},
        {"ragged.csv", "time,a,b\n0,1,2\n1,2\n", "ragged.csv:3: 2 fields, not 3"},
        {"type.csv", "time,a\n0,1\n1,2\n", "unknown item type 123"},
    };
    for (const auto& [file, text, message] : cases) {
        bwtest::WriteFile(dir / file, text);
        std::vector<std::string> args = {"import-asc", file, "-o", "out.xol"};
        if (file.ends_with(".csv"))
            args = {"import-csv", file, "-o", "out.xol", "--start", "2004-01-01", "--types", "123"};
        const auto r = Run(args);
        EXPECT_EQ(r.exitCode, 1) << file;
        EXPECT_TRUE(Has(r.err, message));
        EXPECT_FALSE(fs::exists(dir / "out.xol") || fs::exists(dir / "out.xol.part")) << file;
    }
}

// A profile of the 1DH model from x and bed level: points dx apart give one
// bed item on an axis of that spacing; uneven ones two items, the positions
// and the bed, in the order the mesh reader takes them. x must rise.
TEST_F(DataTool, ProfilesComeFromACsvOfXAndBedLevel) {
    for (const auto& [csv, items, spacing] :
         {std::tuple{"x,z\n10,-1\n10.5,-0.9\n11,-0.8\n", 1, 0.5f},
          std::tuple{"x,bed\n0,-1\n0.5,-0.9\n2,-0.8\n4,0.5\n", 2, 1.0f}}) {
        bwtest::WriteFile(dir / "p.csv", csv);
        Ok({"import-profile", "p.csv", "-o", "p.xol1"});
        XolFile f = XolOpenRead(dir / "p.xol1");
        EXPECT_EQ(f.dimension, 1);
        EXPECT_EQ(f.noDynamicItems, items);
        EXPECT_EQ(f.axes[0].spacing, spacing);
        std::vector<float> x(f.axes[0].count), z(x.size());
        if (items == 2) XolReadDynamic(f, x.data());
        XolReadDynamic(f, z.data());
        XolClose(f);
        EXPECT_EQ(z.front(), -1.0f);
        EXPECT_EQ(z.back(), items == 1 ? -0.8f : 0.5f);
        if (items == 2) EXPECT_EQ(x, (std::vector<float>{0, 0.5f, 2, 4}));
    }
    bwtest::WriteFile(dir / "back.csv", "x,z\n0,-1\n0,-2\n");
    Refused({"import-profile", "back.csv", "-o", "b.xol1"}, "back.csv:3: x must rise");
}

}  // namespace
