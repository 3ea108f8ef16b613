// The bwdata tool as a user runs it: import, look, export.
#include <gtest/gtest.h>

#include <filesystem>

#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

class DataTool : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::RunResult Run(std::vector<std::string> args) {
        args.insert(args.begin(), bwtest::BuiltProgram("bwdata"));
        return bwtest::RunProgram(args, dir.path.string());
    }
};

TEST_F(DataTool, GridRoundTripKeepsTheNumbersAndTheRows) {
    const std::string grid =
        "ncols 3\nnrows 2\nxllcenter 0\nyllcenter 0\ncellsize 2.5\n"
        "NODATA_value -9999\n1.25 2 3\n4 -9999 -6.5\n";
    bwtest::WriteFile(dir / "bay.asc", grid);
    ASSERT_EQ(Run({"import-asc", "bay.asc", "-o", "bay.xol2", "--title", "Bay"}).exitCode, 0);
    auto info = Run({"info", "bay.xol2"});
    EXPECT_EQ(info.exitCode, 0);
    EXPECT_NE(info.out.find("  Title  : Bay\n"), std::string::npos) << info.out;
    EXPECT_NE(
        info.out.find(
            "  Bathymetry           Bathymetry                 -6.5          4       1 meter"),
        std::string::npos)
        << info.out;
    EXPECT_NE(info.out.find("Projection: NON-UTM"), std::string::npos);
    ASSERT_EQ(Run({"export", "bay.xol2", "-o", "back.asc"}).exitCode, 0);
    EXPECT_EQ(bwtest::ReadFile(dir / "back.asc"), grid);
    ASSERT_EQ(Run({"export", "bay.xol2", "-o", "long.csv"}).exitCode, 0);
    // Row k = 0 is the southernmost: the last row of the grid text.
    EXPECT_EQ(bwtest::ReadFile(dir / "long.csv"),
              "j,k,value\n0,0,4\n1,0,\n2,0,-6.5\n0,1,1.25\n1,1,2\n2,1,3\n");

    auto dump = bwtest::RunProgram({"/usr/bin/ncdump", "-h", "bay.xol2"}, dir.path.string());
    EXPECT_NE(dump.out.find("Bathymetry:long_name = \"Bathymetry\""), std::string::npos);
    EXPECT_NE(dump.out.find("Bathymetry:units = \"m\""), std::string::npos);
}

TEST_F(DataTool, ARealProjectionPlacesTheOriginAtTheLowerLeftCell) {
    bwtest::WriteFile(dir / "utm.asc",
                      "ncols 2\nnrows 2\nxllcorner 499990\nyllcorner 5999990\n"
                      "cellsize 20\n1 2\n3 4\n");
    ASSERT_EQ(Run({"import-asc", "utm.asc", "-o", "utm.xol2", "--projection", "UTM-32"}).exitCode,
              0);
    auto info = Run({"info", "utm.xol2"});
    // The lower-left cell centre, easting 500000, lies on the zone's central meridian, 9 degrees
    // east.
    EXPECT_NE(info.out.find("(longitude 9, latitude 54.14"), std::string::npos) << info.out;
    // Back on the map where it came from, as cell centres.
    ASSERT_EQ(Run({"export", "utm.xol2", "-o", "back.asc"}).exitCode, 0);
    EXPECT_EQ(bwtest::ReadFile(dir / "back.asc"),
              "ncols 2\nnrows 2\nxllcenter 500000\nyllcenter 6000000\ncellsize 20\n"
              "NODATA_value -9999\n1 2\n3 4\n");
    // A grid turned on its map has no ASCII grid form.
    ASSERT_EQ(Run({"import-asc", "utm.asc", "-o", "turned.xol2", "--projection", "EPSG:32632",
                   "--orientation", "20"})
                  .exitCode,
              0);
    auto turned = Run({"export", "turned.xol2", "-o", "turned.asc"});
    EXPECT_EQ(turned.exitCode, 1);
    EXPECT_NE(turned.err.find("turned 20 degrees"), std::string::npos) << turned.err;
    EXPECT_FALSE(fs::exists(dir / "turned.asc"));
}

TEST_F(DataTool, SeriesAndLinesRoundTrip) {
    const std::string series = "time,Level,Flux\n0,0.5,1\n2,0.6,1.5\n4,0.7,\n";
    bwtest::WriteFile(dir / "s.csv", series);
    ASSERT_EQ(Run({"import-csv", "s.csv", "-o", "s.xol0", "--start", "2004-01-01 00:00:00",
                   "--types", "100078,100080", "--units", "1000,4700"})
                  .exitCode,
              0);
    ASSERT_EQ(Run({"export", "s.xol0", "-o", "back.csv"}).exitCode, 0);
    EXPECT_EQ(bwtest::ReadFile(dir / "back.csv"), series);

    bwtest::WriteFile(dir / "l.csv", "0,1,2,3\n0.5,4,5,6\n");
    ASSERT_EQ(
        Run({"import-csv", "l.csv", "-o", "l.xol1", "--dx", "5", "--start", "2004-01-01 00:00:00"})
            .exitCode,
        0);
    ASSERT_EQ(Run({"export", "l.xol1", "-o", "l2.csv"}).exitCode, 0);
    EXPECT_EQ(bwtest::ReadFile(dir / "l2.csv"), "time,0,5,10\n0,1,2,3\n0.5,4,5,6\n");
}

TEST_F(DataTool, BadInputIsNamedAndWritesNothing) {
    const struct {
        const char* file;
        const char* text;
        std::vector<std::string> extra;
        const char* message;
    } cases[] = {
        {"ragged.asc",
         "ncols 3\nnrows 2\nxllcorner 0\nyllcorner 0\ncellsize 1\n1 2 3\n4 5\n",
         {},
         "ragged.asc:7: a row of 2 values, not 3"},
        {"word.asc",
         "ncols 2\nnrows 1\nxllcorner 0\nyllcorner 0\ncellsize 1\n1 deep\n",
         {},
         "word.asc:6: 'deep' is not a number"},
        {"long.asc",
         "ncols 2\nnrows 1\nxllcorner 0\nyllcorner 0\ncellsize 1\n1 2\n3 4\n",
         {},
         "long.asc:7: more rows than nrows 1"},
        {"nan.csv", "time,a\n0,1\n1,nan\n", {}, "nan.csv:3: 'nan' is not a number"},
        {"uneven.csv",
         "time,a\n0,1\n1,2\n3,3\n",
         {},
         "uneven.csv:4: the time column is not equidistant"},
        {"ragged.csv", "time,a,b\n0,1,2\n1,2\n", {}, "ragged.csv:3: 2 fields, not 3"},
        {"type.csv", "time,a\n0,1\n1,2\n", {"--types", "123"}, "unknown item type 123"},
    };
    for (const auto& c : cases) {
        bwtest::WriteFile(dir / c.file, c.text);
        const bool asc = std::string(c.file).find(".asc") != std::string::npos;
        std::vector<std::string> args = {asc ? "import-asc" : "import-csv", c.file, "-o",
                                         "out.xol"};
        if (!asc) args.insert(args.end(), {"--start", "2004-01-01 00:00:00"});
        args.insert(args.end(), c.extra.begin(), c.extra.end());
        auto r = Run(args);
        EXPECT_EQ(r.exitCode, 1) << c.file;
        EXPECT_NE(r.err.find(c.message), std::string::npos) << r.err;
        EXPECT_FALSE(fs::exists(dir / "out.xol")) << c.file;
        EXPECT_FALSE(fs::exists(dir / "out.xol.part")) << c.file;
    }
}

}  // namespace
