// The bwdata tool as a user runs it: import, look, export.
#include <gtest/gtest.h>

#include <filesystem>
#include <tuple>

#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

testing::AssertionResult Has(const std::string& text, const std::string& part) {
    if (text.find(part) != std::string::npos) return testing::AssertionSuccess();
    return testing::AssertionFailure() << "no \"" << part << "\" in:\n" << text;
}

class DataTool : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::RunResult Run(std::vector<std::string> args) {
        args.insert(args.begin(), bwtest::BuiltProgram("bwdata"));
        return bwtest::RunProgram(args, dir.path.string());
    }
    // Runs the tool where it must succeed.
    void Ok(const std::vector<std::string>& args) {
        const auto r = Run(args);
        EXPECT_EQ(r.exitCode, 0) << r.err;
    }
};

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

}  // namespace
