// The data-file library: files written and read back with all they hold, what
// the tools of the field see in them, files made by another tool, a writer
// killed midway, and broken files.
#include "platform/xolio/xolio.hpp"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <iomanip>
#include <sstream>
#include <tuple>
#include <utility>
#include <vector>

#include "support/test_support.hpp"

namespace {

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
          "500050, 500052.16506"}},  // (2.5, 100) turned 30 degrees
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
            "Surface_elevation:grid_mapping = \"crs\"",
            "standard_name = \"sea_surface_height_above_mean_sea_level\""};
        expectedText.insert(expectedText.end(), c.dump.begin(), c.dump.end());
        for (const char* text : expectedText)
            EXPECT_NE(dump.out.find(text), std::string::npos) << text << "\n" << dump.out;
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
// axes from the coordinate values.
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
              "1 '' '' 0 delete -999 data 0\ntime 1 unit 1400 0+1x1@0"
              "\nitem 999 'depth' 1000 1 axis 5 1000: 3,100,10 2,50,10");
    std::vector<float> depth(6);
    ASSERT_EQ(xolReadItemTimeStep(h, f, nullptr, depth.data()), 0);
    EXPECT_EQ(depth, (std::vector<float>{-5, -4, -3, -2, -1, -999}));
    EXPECT_EQ(xolReadItemTimeStep(h, f, nullptr, depth.data()), kXolErrEnd);
    xolFileClose(f);
    xolHeaderDestroy(h);
}

TEST(DataFiles, MalformedFilesGiveACodeNeverACrash) {
    bwtest::TempDir dir;
    const std::string good = dir / "good.xol2";
    xolHeaderDestroy(WriteGrid(good, 2));
    const std::string bytes = bwtest::ReadFile(good);
    XolHandle h = 0, f = 0;
    bwtest::WriteFile(dir / "text.xol2", "TARNEL_BOUSSINESQ_WAVE {\n}\n");
    EXPECT_EQ(xolFileRead(dir / "text.xol2", &h, &f), kXolErrOpen);
    // Cut in the mark, in the header and in the last record.
    for (const auto& [cut, code] : {std::pair{size_t{3}, kXolErrOpen},
                                    {size_t{40}, kXolErrFormat},
                                    {bytes.size() - 60, kXolErrFormat}}) {
        bwtest::WriteFile(dir / "cut.xol2", bytes.substr(0, cut));
        EXPECT_EQ(xolFileRead(dir / "cut.xol2", &h, &f), code) << cut;
    }
    const std::string uneven =
        Ncgen(dir, "uneven",
              "netcdf u {\ndimensions:\n x = 3 ;\nvariables:\n float x(x) ;\n"
              " float z(x) ;\ndata:\n x = 0, 1, 3 ;\n z = 1, 2, 3 ;\n}\n");
    EXPECT_EQ(xolFileRead(uneven, &h, &f), kXolErrFormat);
    EXPECT_NE(std::string(xolLastErrorText()).find("not equidistant"), std::string::npos);
}

}  // namespace
