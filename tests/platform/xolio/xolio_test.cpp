// The data-file library: files written and read back with all they hold, what
// the tools of the field see in them, files made by another tool, a writer
// killed midway, and broken files.
#include "platform/xolio/xolio.hpp"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <iomanip>
#include <sstream>
#include <tuple>
#include <utility>
#include <vector>

#include "platform/geo/geo.hpp"
#include "support/test_support.hpp"

namespace {

namespace fs = std::filesystem;

constexpr float kDelete = -1.0e-30f;

// A 2D file on UTM zone 32 (origin on its central meridian): two dynamic
// items and one static item on a 4 x 3 grid, a calendar axis, two custom
// blocks; each step flushed. Value i of item n (0, 1) at step s is
// 100 s + 10 n + i, but value 5 is deleted; the static value i is i - 10.
XolHandle WriteGrid(const std::string& path, int steps, double orientation = 30.0,
                    bool close = true) {
    XolHandle h = 0, f = 0;
    xolHeaderCreate(1, "Harbour run", "bw", 3, 2, 1, &h);
    xolSetDeleteValFloat(h, kDelete);
    xolSetDataType(h, 11);
    xolSetEqCalendarAxis(h, "2004-01-01", "06:30:00", 1400, 0.0, 0.5, 0);
    xolSetGeoInfoUTMProj(h, "UTM-32", 9.0, 54.25, orientation);
    const float other[2] = {-4, 8}, misc[7] = {1, 2, 3, 0.25f, 5, 6, 7};
    xolAddCustomBlock(h, 1, "Other", 2, other);
    xolAddCustomBlock(h, 1, "TRN_Misc", 7, misc);
    const XolHandle st = xolStaticCreate(h);
    for (const auto& [item, type, name, unit] :
         {std::tuple{xolItemD(h, 1), 100078, "Surface elevation", 1000},
          std::tuple{xolItemD(h, 2), 100080, "P flux", 4700},
          std::tuple{xolItemS(st), 100079, "Bathymetry", 1000}}) {
        EXPECT_EQ(xolSetItemInfo(item, type, name, unit, 1), 0);
        EXPECT_EQ(xolSetItemAxisEqD2(item, 1000, 4, 3, 0.0f, 100.0f, 2.5f, 5.0f), 0);
    }
    xolSetItemAttribute(xolItemD(h, 1), {"standard_name", "sea_surface_height", {}});
    xolSetItemAttribute(xolItemD(h, 2), {"position", "", {2.5, 100.0}});
    EXPECT_EQ(xolFileCreate(path, h, &f), 0) << xolLastErrorText();
    std::vector<float> values(12);
    for (int i = 0; i < 12; ++i) values[i] = i - 10.0f;
    EXPECT_EQ(xolStaticWrite(f, st, values.data()), 0) << xolLastErrorText();
    xolStaticDestroy(st);
    for (int s = 0; s < steps; ++s) {
        for (int n = 0; n < 2; ++n) {
            for (int i = 0; i < 12; ++i) values[i] = 100.0f * s + 10.0f * n + i;
            values[5] = kDelete;
            EXPECT_EQ(xolWriteItemTimeStep(h, f, 0.0, values.data()), 0);
        }
        EXPECT_EQ(xolFileFlush(f), 0);
    }
    EXPECT_TRUE(!close || xolFileClose(f) == 0);
    return h;
}

// The header and the dynamic items of a file read back, as one text.
std::string Describe(XolHandle h) {
    std::ostringstream s;
    s << std::setprecision(9) << xolGetFileType(h) << " '" << xolGetFileTitle(h) << "' '"
      << xolGetAppTitle(h) << "' " << xolGetAppVersionNo(h) << " delete " << xolGetDeleteValFloat(h)
      << " data " << xolGetDataType(h);
    std::string text, date, time;
    double lon = 0, lat = 0, orientation = 0, offset = 0, step = 0;
    int type = 0, unit = 0, steps = 0, start = 0, count = 0, counts[4];
    float origins[4], spacings[4];
    if (xolGetGeoInfoType(h) == 1 && xolGetGeoInfoUTMProj(h, &text, &lon, &lat, &orientation) == 0)
        s << " geo " << text << " " << lon << " " << lat << " " << orientation;
    s << "\ntime " << xolGetTimeAxisType(h);
    if (xolGetEqCalendarAxis(h, &date, &time, &unit, &offset, &step, &steps, &start) == 0)
        s << " " << date << " " << time;
    xolGetEqTimeAxis(h, &unit, &offset, &step, &steps, &start);
    s << " unit " << unit << " " << offset << "+" << step << "x" << steps << "@" << start;
    for (XolHandle block = xolGetCustomBlockRef(h); block != 0;) {
        const float* values = nullptr;
        xolGetCustomBlock(block, &type, &text, &count, &values, &block);
        s << "\nblock " << type << " " << text << ":";
        for (int i = 0; i < count; ++i) s << " " << values[i];
    }
    for (int n = 1; n <= xolGetNoOfItems(h); ++n) {
        const XolHandle item = xolItemD(h, n);
        xolGetItemInfo(item, &type, &text, &unit, &count);
        s << "\nitem " << type << " '" << text << "' " << unit << " " << count << " axis "
          << xolGetItemAxisType(item);
        xolGetItemAxisEq(item, &unit, counts, origins, spacings);
        s << " " << unit << ":";
        for (int d = 0; d < xolGetItemDim(item); ++d)
            s << " " << counts[d] << "," << origins[d] << "," << spacings[d];
    }
    return s.str();
}

// A data file made by ncgen from its text.
std::string Ncgen(const bwtest::TempDir& dir, const std::string& name, const std::string& cdl) {
    bwtest::WriteFile(dir / (name + ".cdl"), cdl);
    const auto r = bwtest::RunProgram({"/usr/bin/ncgen", "-5", "-o", name + ".nc", name + ".cdl"},
                                      dir.path.string());
    EXPECT_EQ(r.exitCode, 0) << r.err;
    return dir / (name + ".nc");
}

// Written and read back on an unturned and a turned grid: the header, the
// items with the model's axes, the values in order and in the unit asked
// (delete values as they are), the statistics of what was written (delete
// values aside); and what ncdump shows: CF names, the grid mapping, projected
// axes for the unturned grid and projected points for the turned one.
TEST(DataFiles, GridFileReadsBackWithAllItHolds) {
    const struct {
        double orientation;
        const char* geo;
        std::vector<const char*> dump;
    } cases[] = {
        {0.0, "geo UTM-32 9 54.25 0", {" x = 500000, 500002.5, 500005, 500007.5 ;"}},
        {30.0,
         "geo UTM-32 9 54.25 30",
         {" x = 0, 2.5, 5, 7.5 ;", "Surface_elevation:coordinates = \"projection_y projection_x\"",
          "500000, 500002.16506"}},  // (2.5, 0) from the first point, turned 30 degrees
    };
    for (const auto& c : cases) {
        bwtest::TempDir dir;
        const std::string path = dir / "grid.xol2";
        XolHandle h = WriteGrid(path, 3, c.orientation);
        double minimum = 0, maximum = 0;
        long missing = 0;
        xolGetItemStatsGlobal(xolItemD(h, 2), &minimum, &maximum, &missing);
        EXPECT_EQ(std::make_tuple(minimum, maximum, missing), std::make_tuple(10.0, 221.0, 3L));
        xolHeaderDestroy(h);

        XolHandle f = 0;
        ASSERT_EQ(xolFileRead(path, &h, &f), 0) << xolLastErrorText();
        EXPECT_EQ(Describe(h), "1 'Harbour run' 'bw' 3 delete -1e-30 data 11 " +
                                   std::string(c.geo) +
                                   "\ntime 3 2004-01-01 06:30:00 unit 1400 0+0.5x3@0"
                                   "\nblock 1 Other: -4 8\nblock 1 TRN_Misc: 1 2 3 0.25 5 6 7"
                                   "\nitem 100078 'Surface elevation' 1000 1 axis 5 1000: "
                                   "4,0,2.5 3,100,5"
                                   "\nitem 100080 'P flux' 4700 1 axis 5 1000: 4,0,2.5 3,100,5");
        std::vector<float> feet(12), values(12), expected(12);
        xolFindBlockDynamic(f);
        xolSetItemUnitConversion(xolItemD(h, 1), 3, 1003);
        double t = 0;
        for (int s = 0; s < 3; ++s) {
            ASSERT_EQ(xolReadItemTimeStep(h, f, &t, feet.data()), 0);
            EXPECT_FLOAT_EQ(feet[1], (100.0f * s + 1) / 0.3048f);
            EXPECT_EQ(feet[5], kDelete);
            ASSERT_EQ(xolReadItemTimeStep(h, f, &t, values.data()), 0);
            for (int i = 0; i < 12; ++i) expected[i] = i == 5 ? kDelete : 100.0f * s + 10 + i;
            EXPECT_EQ(values, expected) << s;
            EXPECT_EQ(t, 0.5 * s);
        }
        EXPECT_EQ(xolReadItemTimeStep(h, f, &t, values.data()), kXolErrEnd);
        xolFileClose(f);
        xolHeaderDestroy(h);

        const auto dump = bwtest::RunProgram({"/usr/bin/ncdump", path}, dir.path.string());
        ASSERT_EQ(dump.exitCode, 0);
        std::vector<const char*> expectedText = {
            ":Conventions = \"CF-1.8\"",
            "float Surface_elevation(time, y, x)",
            "float Bathymetry(y, x)",
            "time:units = \"seconds since 2004-01-01 06:30:00\"",
            "crs:crs_wkt = \"PROJCRS[\\\"WGS 84 / UTM zone 32N\\\"",
            "crs:spatial_ref = \"PROJCS[\\\"WGS 84 / UTM zone 32N\\\"",
            "crs:grid_mapping_name = \"transverse_mercator\"",
            "crs:longitude_of_central_meridian = 9. ;",
            "crs:scale_factor_at_central_meridian = 0.9996 ;",
            "crs:false_easting = 500000. ;",
            "crs:inverse_flattening = 298.257223563 ;",
            "Surface_elevation:grid_mapping = \"crs\"",
            "Surface_elevation:standard_name = \"sea_surface_height\"",
            "P_flux:position = 2.5, 100. ;"};
        expectedText.insert(expectedText.end(), c.dump.begin(), c.dump.end());
        for (const char* text : expectedText)
            EXPECT_NE(dump.out.find(text), std::string::npos) << text << "\n" << dump.out;
        // The classic format with 64-bit offsets, which every NetCDF reader opens.
        EXPECT_EQ(bwtest::ReadFile(path).substr(0, 4), std::string("CDF\x02"));
    }
}

TEST(DataFiles, AKilledWriterLeavesItsFlushedSteps) {
    bwtest::TempDir dir;
    const std::string path = dir / "killed.xol2";
    const pid_t child = fork();
    if (child == 0) {
        WriteGrid(path, 4, 30.0, false);  // flushed after each step, never closed
        raise(SIGKILL);
    }
    int status = 0;
    waitpid(child, &status, 0);
    ASSERT_TRUE(WIFSIGNALED(status));
    XolHandle h = 0, f = 0;
    ASSERT_EQ(xolFileRead(path, &h, &f), 0) << xolLastErrorText();
    EXPECT_NE(Describe(h).find("unit 1400 0+0.5x4@0"), std::string::npos) << Describe(h);
    std::vector<float> values(12);
    for (int i = 0; i < 7; ++i) xolSkipItem(h, f);
    ASSERT_EQ(xolReadItemTimeStep(h, f, nullptr, values.data()), 0);
    EXPECT_EQ(values[0], 310.0f);  // the last item of the last step
    xolFileClose(f);
    xolHeaderDestroy(h);
    EXPECT_EQ(bwtest::RunProgram({"/usr/bin/ncdump", path}, dir.path.string()).exitCode, 0);
}

// A map without time, of another tool: one step of one item of undefined
// type, the unit from its CF text, the delete value from _FillValue and the
// axes from the coordinate values. Its place is its first point: without a
// grid mapping on no map, at the first point's coordinates; with one (as GDAL
// and xarray write it) on the CRS of its WKT, at the longitude and latitude
// of that point and the orientation of a grid unturned on its map.
TEST(DataFiles, AFileMadeWithNcgenTakesSensibleDefaults) {
    bwtest::TempDir dir;
    const std::string path =
        Ncgen(dir, "bay",
              "netcdf bay {\ndimensions:\n x = 3 ;\n y = 2 ;\nvariables:\n"
              " double x(x) ;\n  x:units = \"m\" ;\n double y(y) ;\n  y:units = \"m\" ;\n"
              " float depth(y, x) ;\n  depth:units = \"m\" ;\n  depth:_FillValue = -999.f ;\n"
              "data:\n x = 100, 110, 120 ;\n y = 50, 60 ;\n"
              " depth = -5, -4, -3, -2, -1, -999 ;\n}\n");
    XolHandle h = 0, f = 0;
    ASSERT_EQ(xolFileRead(path, &h, &f), 0) << xolLastErrorText();
    EXPECT_EQ(Describe(h),
              "1 '' '' 0 delete -999 data 0 geo NON-UTM 100 50 0\ntime 1 unit 1400 0+1x1@0"
              "\nitem 999 'depth' 1000 1 axis 5 1000: 3,0,10 2,0,10");
    std::vector<float> depth(6);
    ASSERT_EQ(xolReadItemTimeStep(h, f, nullptr, depth.data()), 0);
    EXPECT_EQ(depth, (std::vector<float>{-5, -4, -3, -2, -1, -999}));
    EXPECT_EQ(xolReadItemTimeStep(h, f, nullptr, depth.data()), kXolErrEnd);
    xolFileClose(f);
    xolHeaderDestroy(h);

    const char* wkt =
        "PROJCS[\\\"ETRS89 / UTM zone 32N\\\",GEOGCS[\\\"ETRS89\\\",DATUM[\\\"ETRS89\\\","
        "SPHEROID[\\\"GRS 1980\\\",6378137,298.257222101]],PRIMEM[\\\"Greenwich\\\",0],"
        "UNIT[\\\"degree\\\",0.0174532925199433]],PROJECTION[\\\"Transverse_Mercator\\\"],"
        "PARAMETER[\\\"latitude_of_origin\\\",0],PARAMETER[\\\"central_meridian\\\",9],"
        "PARAMETER[\\\"scale_factor\\\",0.9996],PARAMETER[\\\"false_easting\\\",500000],"
        "PARAMETER[\\\"false_northing\\\",0],UNIT[\\\"metre\\\",1]]";
    const std::string mapped =
        Ncgen(dir, "mapped",
              std::string("netcdf mapped {\ndimensions:\n x = 3 ;\n y = 2 ;\nvariables:\n"
                          " double x(x) ;\n double y(y) ;\n int spatial_ref ;\n"
                          "  spatial_ref:spatial_ref = \"") +
                  wkt +
                  "\" ;\n float band(y, x) ;\n  band:grid_mapping = \"spatial_ref\" ;\n"
                  "data:\n x = 600005, 600015, 600025 ;\n y = 6000005, 6000015 ;\n"
                  " band = 1, 2, 3, 4, 5, 6 ;\n}\n");
    ASSERT_EQ(xolFileRead(mapped, &h, &f), 0) << xolLastErrorText();
    std::string projection;
    double lon = 0, lat = 0, orientation = 0, x = 0, y = 0, turn = 1;
    ASSERT_EQ(xolGetGeoInfoUTMProj(h, &projection, &lon, &lat, &orientation), 0);
    EXPECT_EQ(projection, "EPSG:25832");  // a CRS PROJ knows, by its code
    EXPECT_EQ(xolGetNoOfItems(h), 1);  // the grid mapping is no item
    EXPECT_EQ(Describe(h).substr(Describe(h).find("\nitem")),
              "\nitem 999 'band' 99000 1 axis 5 1000: 3,0,10 2,0,10");
    GeoHandle frame = 0;
    ASSERT_EQ(GeoOpen(&frame, projection, lon, lat, orientation), 0);
    GeoXy2Proj(frame, 0.0, 0.0, x, y);
    GeoProjectionNorth(frame, turn);
    EXPECT_NEAR(x, 600005.0, 1e-6);
    EXPECT_NEAR(y, 6000005.0, 1e-6);
    EXPECT_EQ(turn, 0.0);
    EXPECT_NEAR(orientation, 1.3, 0.1);  // about 1.6 degrees east of the meridian at 54 N
    GeoClose(frame);
    xolFileClose(f);
    xolHeaderDestroy(h);
}

// What a failed call of the library gives: its code and its reason.
std::string Failure(int code) {
    return std::to_string(code) + " " + xolLastErrorText();
}

std::string OpenFailure(const std::string& path) {
    XolHandle h = 0, f = 0;
    const int code = xolFileRead(path, &h, &f);
    if (code == 0) {
        xolFileClose(f);
        xolHeaderDestroy(h);
    }
    return code == 0 ? "0" : Failure(code);
}

// Writes a line file of `points` points, `steps` steps flushed one by one, as
// far as it goes; ends the process with the code of the first failure and
// its reason on standard error (a death test's child reads it).
[[noreturn]] void WriteUntilItFails(const std::string& path, int points, int steps) {
    XolHandle h = 0, f = 0;
    xolHeaderCreate(1, "Line", "bw", 0, 1, 1, &h);
    xolSetItemInfo(xolItemD(h, 1), 999, "Level", 0, 1);
    xolSetItemAxisEqD1(xolItemD(h, 1), 1000, points, 0.0f, 1.0f);
    int code = xolFileCreate(path, h, &f);
    const std::vector<float> values(static_cast<size_t>(points), 1.0f);
    for (int s = 0; s < steps && code == 0; ++s) {
        code = xolWriteItemTimeStep(h, f, 0.0, values.data());
        if (code == 0) code = xolFileFlush(f);
    }
    if (code == 0) code = xolFileClose(f);
    std::fprintf(stderr, "%s\n", xolLastErrorText());
    std::_Exit(code);
}

// A full disk for this process: files end at `bytes`, and a write beyond
// fails instead of raising its signal.
void LimitFileSize(rlim_t bytes) {
    signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{bytes, bytes};
    setrlimit(RLIMIT_FSIZE, &limit);
}

// Files that can't be read or written give the code of the failure and the
// reason in the words of the system, of NetCDF or of this library: a file
// missing, a folder, a text, an empty file, files cut in the mark, in the
// header and in the last record, a header whose counts reach beyond the
// file; a missing folder, a folder the process may not write and a full
// disk (a limit on the size of the process's files, its signal ignored).
TEST(DataFiles, EveryFailureGivesItsCodeAndItsReason) {
    bwtest::TempDir dir;
    const std::string good = dir / "good.xol2";
    xolHeaderDestroy(WriteGrid(good, 2));
    const std::string bytes = bwtest::ReadFile(good);
    // The count of axes (bytes 12 to 15 of the classic format) beyond the file.
    std::string lying = bytes;
    lying.replace(12, 4, std::string("\x7f\xff\xff\xff", 4));
    const std::string open = std::to_string(kXolErrOpen) + " ";
    const std::string format = std::to_string(kXolErrFormat) + " ";
    const struct {
        const char* name;
        std::string content;  // none: no file of that name
        std::string expected;
    } cases[] = {
        {"absent.xol2", "", open + "no such file or directory"},
        {"text.xol2", "TARNEL_BOUSSINESQ_WAVE {\n}\n", open + "not a data file of this engine"},
        {"empty.xol2", "", open + "the file is empty"},
        {"mark.xol2", bytes.substr(0, 3), open + "the file is cut short"},
        {"header.xol2", bytes.substr(0, 40), format + "the file is cut short"},
        {"record.xol2", bytes.substr(0, bytes.size() - 60), format + "the file is cut short"},
        {"lying.xol2", lying,
         format + "the header declares 2147483647 axes, more than the file holds"},
    };
    for (const auto& c : cases) {
        if (c.name != std::string("absent.xol2")) bwtest::WriteFile(dir / c.name, c.content);
        EXPECT_EQ(OpenFailure(dir / c.name), c.expected) << c.name;
    }
    EXPECT_EQ(OpenFailure(dir.path.string()), open + "a folder, not a file");

    XolHandle h = 0, f = 0;
    xolHeaderCreate(1, "t", "bw", 0, 1, 1, &h);
    xolSetItemInfo(xolItemD(h, 1), 999, "a", 0, 1);
    xolSetItemAxisEqD0(xolItemD(h, 1), 1000);
    EXPECT_EQ(xolFileCreate(dir / "no/such/folder.xol0", h, &f), kXolErrWrite);
    EXPECT_STREQ(xolLastErrorText(), "no such file or directory");
    xolHeaderDestroy(h);
    // Another user than root where the tests run as root.
    const std::string locked = dir / "locked";
    fs::create_directory(locked);
    fs::permissions(locked, fs::perms::owner_read | fs::perms::owner_exec);
    EXPECT_EXIT(
        {
            if (getuid() == 0 && (setgid(65534) != 0 || setuid(65534) != 0)) std::_Exit(99);
            WriteUntilItFails(locked + "/line.xol1", 10, 1);
        },
        testing::ExitedWithCode(kXolErrWrite), "^permission denied");
    EXPECT_EXIT(
        {
            LimitFileSize(65536);
            WriteUntilItFails(dir / "full.xol1", 4096, 100);
        },
        testing::ExitedWithCode(kXolErrWrite), "^file too large");
}

// Axes that can't be used are refused at open with the reason: no finite
// origin or spacing, a spacing of 0, a falling axis, coordinates not
// equidistant or not finite, more points than 32 bits count (a NetCDF-4 file
// declares them without holding them), more than four spatial axes, the time
// axis elsewhere than first, and a header that counts more custom blocks than
// it holds. A coordinate in 32 bits far from its origin is equidistant within
// its rounding; a coordinate of two dimensions is no coordinate, and of an
// attribute of several values the first counts.
TEST(DataFiles, UnusableAxesAreRefusedAtOpen) {
    bwtest::TempDir dir;
    auto file = [&](const std::string& name, const std::string& dims, const std::string& vars,
                    const std::string& data, const char* kind = "-5") {
        const std::string cdl =
            "netcdf f {\ndimensions:\n" + dims + "variables:\n" + vars + "data:\n" + data + "}\n";
        bwtest::WriteFile(dir / (name + ".cdl"), cdl);
        const auto r = bwtest::RunProgram(
            {"/usr/bin/ncgen", kind, "-o", name + ".nc", name + ".cdl"}, dir.path.string());
        EXPECT_EQ(r.exitCode, 0) << r.err;
        return dir / (name + ".nc");
    };
    const std::string x3 = " x = 3 ;\n";
    const std::string xz = " double x(x) ;\n float z(x) ;\n";
    const std::string z = " z = 1, 2, 3 ;\n";
    const std::string format = std::to_string(kXolErrFormat) + " ";
    const std::pair<std::string, std::string> cases[] = {
        {file("zero", x3, xz, " x = 5, 5, 5 ;\n" + z), format + "axis x has spacing 0"},
        {file("falls", x3, xz, " x = 20, 10, 0 ;\n" + z),
         format + "axis x falls (spacing -10): its values must rise"},
        {file("given0", x3, xz + "  x:spacing = 0. ;\n", " x = 0, 1, 2 ;\n" + z),
         format + "axis x has spacing 0"},
        {file("origin", x3, xz + "  x:origin = NaN ;\n", " x = 0, 1, 2 ;\n" + z),
         format + "axis x has an origin that is not a finite number"},
        {file("spacing", x3, xz + "  x:spacing = Infinity ;\n", " x = 0, 1, 2 ;\n" + z),
         format + "axis x has a spacing that is not a finite number"},
        {file("nan", x3, xz, " x = 0, NaN, 2 ;\n" + z),
         format + "axis x holds a value that is not a finite number"},
        {file("uneven", x3, xz, " x = 0, 1, 3 ;\n" + z), format + "axis x is not equidistant"},
        {file("huge", " x = 3000000000 ;\n y = 2 ;\n", " float depth(y, x) ;\n", "", "-4"),
         format + "axis x has 3000000000 points, more than a data file may hold"},
        {file("five", " a = 1 ;\n b = 1 ;\n c = 1 ;\n d = 1 ;\n e = 1 ;\n",
              " float v(a, b, c, d, e) ;\n", " v = 1 ;\n"),
         format + "item v has 5 spatial axes, more than four"},
        {file("late", x3 + " t = UNLIMITED ;\n", " float v(x, t) ;\n", " v = {1}, {2}, {3} ;\n",
              "-4"),
         format + "item v has the time axis in another place than first"},
        {file("blocks", x3, " float z(x) ;\n// global attributes:\n :custom_block_count = 9 ;\n",
              z),
         format + "custom_block_count is 9, but the file holds 1 attributes"},
        {file("utm", " x = 4 ;\n", " float x(x) ;\n float z(x) ;\n",
              " x = 500000.1, 500000.2, 500000.3, 500000.4 ;\n z = 1, 2, 3, 4 ;\n"),
         "0"},
        {file("aside", x3 + " n = 2 ;\n",
              " char x(x, n) ;\n float z(x) ;\n  z:item_type = 1, 2, 3 ;\n",
              " x = \"a\", \"b\", \"c\" ;\n" + z),
         "0"},
    };
    for (const auto& [path, expected] : cases) EXPECT_EQ(OpenFailure(path), expected) << path;

    XolHandle h = 0, f = 0;
    ASSERT_EQ(xolFileRead(dir / "aside.nc", &h, &f), 0);
    EXPECT_EQ(Describe(h),
              "1 '' '' 0 delete -1e-30 data 0\ntime 1 unit 1400 0+1x1@0"
              "\nitem 1 'z' 99000 1 axis 2 1000: 3,0,1");
    xolFileClose(f);
    xolHeaderDestroy(h);
}

}  // namespace
