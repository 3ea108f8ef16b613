#include "platform/xolio/xolio.hpp"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <vector>

#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

constexpr float kDelete = -1.0e-30f;

// A 2D file of two dynamic items on a 4 x 3 grid, one static item, calendar
// axis, projection and two custom blocks; steps written, each flushed.
XolHandle WriteGrid(const std::string& path, int steps, bool close = true) {
    XolHandle h = 0, f = 0;
    EXPECT_EQ(xolHeaderCreate(1, "Harbour run", "bw", 3, 2, 1, &h), 0);
    xolSetDeleteValFloat(h, kDelete);
    xolSetDataType(h, 11);
    xolSetEqCalendarAxis(h, "2004-01-01", "06:30:00", 1400, 0.0, 0.5, 0);
    xolSetGeoInfoUTMProj(h, "UTM-32", 9.5, 54.25, 12.5);
    const char* names[] = {"Surface elevation", "P flux"};
    const int types[] = {100078, 100080};
    const int units[] = {1000, 4700};
    for (int n = 1; n <= 2; ++n) {
        const XolHandle item = xolItemD(h, n);
        EXPECT_EQ(xolSetItemInfo(item, types[n - 1], names[n - 1], units[n - 1], 1), 0);
        xolSetItemUnitConversion(item, 3, units[n - 1]);
        EXPECT_EQ(xolSetItemAxisEqD2(item, 1000, 4, 3, 0.0f, 100.0f, 2.5f, 5.0f), 0);
    }
    const float misc[7] = {1, 2, 3, 0.25f, 5, 6, 7};
    const float other[2] = {-4, 8};
    xolAddCustomBlock(h, 1, "Other", 2, other);
    xolAddCustomBlock(h, 1, "TRN_Misc", 7, misc);
    EXPECT_EQ(xolFileCreate(path, h, &f), 0) << xolLastErrorText();

    const XolHandle st = xolStaticCreate(h);
    const XolHandle si = xolItemS(st);
    xolSetItemInfo(si, 100079, "Bathymetry", 1000, 1);
    xolSetItemAxisEqD2(si, 1000, 4, 3, 0.0f, 100.0f, 2.5f, 5.0f);
    std::vector<float> bed(12);
    for (int i = 0; i < 12; ++i) bed[i] = -10.0f + i;
    EXPECT_EQ(xolStaticWrite(f, st, bed.data()), 0) << xolLastErrorText();
    xolStaticDestroy(st);

    std::vector<float> values(12);
    for (int s = 0; s < steps; ++s) {
        for (int n = 0; n < 2; ++n) {
            for (int i = 0; i < 12; ++i) values[i] = 100.0f * s + 10.0f * n + i;
            values[5] = kDelete;
            EXPECT_EQ(xolWriteItemTimeStep(h, f, 0.0, values.data()), 0);
        }
        EXPECT_EQ(xolFileFlush(f), 0);
    }
    if (close) {
        EXPECT_EQ(xolFileClose(f), 0);
    }
    return h;
}

TEST(DataFiles, GridFileReadsBackWithEverythingItHolds) {
    bwtest::TempDir dir;
    const std::string path = dir / "grid.xol2";
    XolHandle w = WriteGrid(path, 3);
    double minimum = 0, maximum = 0;
    long missing = 0;
    xolGetItemStatsGlobal(xolItemD(w, 2), &minimum, &maximum, &missing);
    EXPECT_EQ(minimum, 10.0);  // statistics of what was written, delete values aside
    EXPECT_EQ(maximum, 221.0);
    EXPECT_EQ(missing, 3);
    xolHeaderDestroy(w);

    XolHandle h = 0, f = 0;
    ASSERT_EQ(xolFileRead(path, &h, &f), 0) << xolLastErrorText();
    EXPECT_EQ(xolGetFileType(h), 1);
    EXPECT_EQ(xolGetFileTitle(h), "Harbour run");
    EXPECT_EQ(xolGetAppTitle(h), "bw");
    EXPECT_EQ(xolGetAppVersionNo(h), 3);
    EXPECT_EQ(xolGetDeleteValFloat(h), kDelete);
    EXPECT_EQ(xolGetDataType(h), 11);
    std::string projection;
    double lon, lat, orient;
    ASSERT_EQ(xolGetGeoInfoType(h), 1);
    xolGetGeoInfoUTMProj(h, &projection, &lon, &lat, &orient);
    EXPECT_EQ(projection, "UTM-32");
    EXPECT_EQ(lon, 9.5);
    EXPECT_EQ(orient, 12.5);

    // Custom blocks in their order.
    XolHandle block = xolGetCustomBlockRef(h);
    std::vector<std::string> blocks;
    while (block != 0) {
        int type, count;
        std::string name;
        const float* values;
        xolGetCustomBlock(block, &type, &name, &count, &values, &block);
        blocks.push_back(name + ":" + std::to_string(count) + ":" +
                         std::to_string(values[count - 1]));
    }
    EXPECT_EQ(blocks, (std::vector<std::string>{"Other:2:8.000000", "TRN_Misc:7:7.000000"}));

    std::string date, time;
    int unit, steps, startIndex;
    double offset, step;
    ASSERT_EQ(xolGetTimeAxisType(h), 3);
    xolGetEqCalendarAxis(h, &date, &time, &unit, &offset, &step, &steps, &startIndex);
    EXPECT_EQ(date + " " + time, "2004-01-01 06:30:00");
    EXPECT_EQ(step, 0.5);
    EXPECT_EQ(steps, 3);

    ASSERT_EQ(xolGetNoOfItems(h), 2);
    int type, itemUnit, dataType;
    std::string name;
    xolGetItemInfo(xolItemD(h, 2), &type, &name, &itemUnit, &dataType);
    EXPECT_EQ(name, "P flux");
    EXPECT_EQ(type, 100080);
    EXPECT_EQ(itemUnit, 4700);
    EXPECT_EQ(xolGetItemAxisType(xolItemD(h, 1)), kXolAxisEq2);
    int counts[4];
    float origins[4], spacings[4];
    xolGetItemAxisEq(xolItemD(h, 1), &unit, counts, origins, spacings);
    EXPECT_EQ(counts[0], 4);
    EXPECT_EQ(counts[1], 3);
    EXPECT_EQ(origins[1], 100.0f);
    EXPECT_EQ(spacings[0], 2.5f);
    EXPECT_EQ(spacings[1], 5.0f);

    ASSERT_EQ(xolFindBlockStatic(f), 0);
    const XolHandle st = xolStaticRead(f);
    ASSERT_NE(st, 0u);
    std::vector<float> bed(12);
    xolStaticGetData(st, bed.data());
    EXPECT_EQ(bed[11], 1.0f);
    EXPECT_EQ(xolStaticRead(f), 0u);  // no second static item

    xolFindBlockDynamic(f);
    std::vector<float> values(12);
    double t = 0;
    for (int s = 0; s < 3; ++s) {
        ASSERT_EQ(xolSkipItem(h, f), 0);
        ASSERT_EQ(xolReadItemTimeStep(h, f, &t, values.data()), 0);
        EXPECT_EQ(t, 0.5 * s);
        EXPECT_EQ(values[0], 100.0f * s + 10.0f);  // x varies fastest
        EXPECT_EQ(values[7], 100.0f * s + 17.0f);
        EXPECT_EQ(values[5], kDelete);
    }
    EXPECT_EQ(xolReadItemTimeStep(h, f, &t, values.data()), kXolErrEnd);
    xolFileClose(f);
    xolHeaderDestroy(h);

    // What the tools of the field see.
    auto dump = bwtest::RunProgram({"/usr/bin/ncdump", "-h", path}, dir.path.string());
    EXPECT_EQ(dump.exitCode, 0);
    for (const char* expected : {"float Surface_elevation(time, y, x)", "P_flux:units = \"m2 s-1\"",
                                 "time:units = \"seconds since 2004-01-01 06:30:00\"",
                                 ":Conventions = \"CF-1.8\"", "float Bathymetry(y, x)"})
        EXPECT_NE(dump.out.find(expected), std::string::npos) << expected << "\n" << dump.out;
}

TEST(DataFiles, SeriesFileWithARelativeAxisAndUnitConversion) {
    bwtest::TempDir dir;
    const std::string path = dir / "series.xol0";
    XolHandle h = 0, f = 0;
    xolHeaderCreate(1, "Gauges", "bw", 0, 2, 1, &h);
    xolSetEqTimeAxis(h, 1400, 10.0, 2.0, 0);
    xolSetItemInfo(xolItemD(h, 1), 100078, "Level", 1003, 1);  // kept in feet on disk
    xolSetItemUnitConversion(xolItemD(h, 1), 3, 1000);         // passed in metres
    xolSetItemAxisEqD0(xolItemD(h, 1), 1000);
    xolSetItemInfo(xolItemD(h, 2), 999, "Counter", 0, 1);
    xolSetItemAxisEqD0(xolItemD(h, 2), 1000);
    ASSERT_EQ(xolFileCreate(path, h, &f), 0);
    for (int s = 0; s < 4; ++s) {
        const float level = 0.3048f * s, count = static_cast<float>(s);
        xolWriteItemTimeStep(h, f, 0.0, &level);
        xolWriteItemTimeStep(h, f, 0.0, &count);
    }
    xolFileClose(f);
    xolHeaderDestroy(h);

    ASSERT_EQ(xolFileRead(path, &h, &f), 0) << xolLastErrorText();
    EXPECT_EQ(xolGetTimeAxisType(h), kXolTimeRelative);
    EXPECT_EQ(xolGetItemDim(xolItemD(h, 1)), 0);
    xolSetItemUnitConversion(xolItemD(h, 1), 3, 1000);
    float level = 0, count = 0;
    double t = 0;
    for (int s = 0; s < 4; ++s) {
        xolReadItemTimeStep(h, f, &t, &level);
        xolReadItemTimeStep(h, f, &t, &count);
        EXPECT_NEAR(level, 0.3048f * s, 1e-6f);
        EXPECT_EQ(count, s);
        EXPECT_EQ(t, 10.0 + 2.0 * s);
    }
    xolFileClose(f);
    xolHeaderDestroy(h);
}

TEST(DataFiles, AKilledWriterLeavesItsFlushedSteps) {
    bwtest::TempDir dir;
    const std::string path = dir / "killed.xol2";
    const pid_t child = fork();
    if (child == 0) {
        WriteGrid(path, 4, false);  // flushed after each step, never closed
        raise(SIGKILL);
    }
    int status = 0;
    waitpid(child, &status, 0);
    ASSERT_TRUE(WIFSIGNALED(status));
    XolHandle h = 0, f = 0;
    ASSERT_EQ(xolFileRead(path, &h, &f), 0) << xolLastErrorText();
    int unit, steps, startIndex;
    double offset, step;
    xolGetEqTimeAxis(h, &unit, &offset, &step, &steps, &startIndex);
    EXPECT_EQ(steps, 4);
    std::vector<float> values(12);
    for (int i = 0; i < 7; ++i) xolSkipItem(h, f);
    ASSERT_EQ(xolReadItemTimeStep(h, f, nullptr, values.data()), 0);
    EXPECT_EQ(values[0], 310.0f);
    xolFileClose(f);
    xolHeaderDestroy(h);
    EXPECT_EQ(bwtest::RunProgram({"/usr/bin/ncdump", path}, dir.path.string()).exitCode, 0);
}

TEST(DataFiles, AFileMadeWithNcgenTakesSensibleDefaults) {
    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "bay.cdl", R"(netcdf bay {
dimensions:
    x = 3 ;
    y = 2 ;
variables:
    double x(x) ;
        x:units = "m" ;
    double y(y) ;
        y:units = "m" ;
    float depth(y, x) ;
        depth:units = "m" ;
        depth:_FillValue = -999.f ;
data:
    x = 100, 110, 120 ;
    y = 50, 60 ;
    depth = -5, -4, -3, -2, -1, -999 ;
}
)");
    ASSERT_EQ(
        bwtest::RunProgram({"/usr/bin/ncgen", "-5", "-o", "bay.nc", "bay.cdl"}, dir.path.string())
            .exitCode,
        0);
    XolHandle h = 0, f = 0;
    ASSERT_EQ(xolFileRead(dir / "bay.nc", &h, &f), 0) << xolLastErrorText();
    ASSERT_EQ(xolGetNoOfItems(h), 1);  // no time axis: one step of one item
    const XolHandle item = xolItemD(h, 1);
    int type, unit, dataType, counts[4];
    float origins[4], spacings[4];
    std::string name;
    xolGetItemInfo(item, &type, &name, &unit, &dataType);
    EXPECT_EQ(type, 999);
    EXPECT_EQ(unit, 1000);
    EXPECT_EQ(name, "depth");
    EXPECT_EQ(xolGetDeleteValFloat(h), -999.0f);
    xolGetItemAxisEq(item, &unit, counts, origins, spacings);
    EXPECT_EQ(counts[0], 3);
    EXPECT_EQ(origins[0], 100.0f);
    EXPECT_EQ(spacings[1], 10.0f);
    float depth[6];
    ASSERT_EQ(xolReadItemTimeStep(h, f, nullptr, depth), 0);
    EXPECT_EQ(depth[2], -3.0f);
    EXPECT_EQ(depth[5], -999.0f);
    EXPECT_EQ(xolReadItemTimeStep(h, f, nullptr, depth), kXolErrEnd);
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
    EXPECT_EQ(xolFileRead(dir / "absent.xol2", &h, &f), kXolErrOpen);
    // Cut in the header, in the padding behind it, and in the last record.
    for (size_t cut :
         {size_t{0}, size_t{3}, size_t{40}, size_t{400}, bytes.size() / 2, bytes.size() - 60}) {
        bwtest::WriteFile(dir / "cut.xol2", bytes.substr(0, cut));
        EXPECT_NE(xolFileRead(dir / "cut.xol2", &h, &f), 0) << cut;
    }

    bwtest::WriteFile(dir / "uneven.cdl",
                      "netcdf u {\ndimensions:\n x = 3 ;\nvariables:\n float x(x) ;\n"
                      " float z(x) ;\ndata:\n x = 0, 1, 3 ;\n z = 1, 2, 3 ;\n}\n");
    bwtest::RunProgram({"/usr/bin/ncgen", "-5", "-o", "uneven.nc", "uneven.cdl"},
                       dir.path.string());
    EXPECT_EQ(xolFileRead(dir / "uneven.nc", &h, &f), kXolErrFormat);
    EXPECT_NE(std::string(xolLastErrorText()).find("not equidistant"), std::string::npos);
}

}  // namespace

namespace {

TEST(DataFiles, AFileOnARealProjectionCarriesItsGridMapping) {
    bwtest::TempDir dir;
    for (double orientation : {0.0, 30.0}) {
        const std::string path = dir / ("utm" + std::to_string(int(orientation)) + ".xol2");
        XolHandle h = 0, f = 0;
        xolHeaderCreate(1, "utm", "bw", 0, 1, 1, &h);
        xolSetGeoInfoUTMProj(h, "UTM-32", 9.0, 54.0, orientation);
        xolSetItemInfo(xolItemD(h, 1), 100078, "Surface elevation", 1000, 1);
        xolSetItemAxisEqD2(xolItemD(h, 1), 1000, 3, 2, 0.0f, 0.0f, 10.0f, 10.0f);
        ASSERT_EQ(xolFileCreate(path, h, &f), 0) << xolLastErrorText();
        const float values[6] = {1, 2, 3, 4, 5, 6};
        xolWriteItemTimeStep(h, f, 0.0, values);
        xolFileClose(f);
        xolHeaderDestroy(h);

        const std::string dump =
            bwtest::RunProgram({"/usr/bin/ncdump", path}, dir.path.string()).out;
        EXPECT_NE(dump.find("crs:crs_wkt = \"PROJCRS[\\\"WGS 84 / UTM zone 32N\\\""),
                  std::string::npos)
            << dump;
        EXPECT_NE(dump.find("Surface_elevation:grid_mapping = \"crs\""), std::string::npos);
        EXPECT_NE(dump.find("standard_name = \"sea_surface_height_above_mean_sea_level\""),
                  std::string::npos);
        if (orientation == 0.0) {
            // The origin lies on the central meridian of zone 32, 9 degrees east: easting 500000.
            EXPECT_NE(dump.find(" x = 500000, 500010, 500020 ;"), std::string::npos) << dump;
        } else {
            EXPECT_NE(dump.find("Surface_elevation:coordinates = \"projection_y projection_x\""),
                      std::string::npos);
            EXPECT_NE(dump.find("500008.66025"),
                      std::string::npos);  // 10 m along x, turned 30 degrees
        }
        // Reading it back: the auxiliary coordinates are no items, the axes are the model's.
        ASSERT_EQ(xolFileRead(path, &h, &f), 0) << xolLastErrorText();
        EXPECT_EQ(xolGetNoOfItems(h), 1);
        int unit, counts[4];
        float origins[4], spacings[4];
        xolGetItemAxisEq(xolItemD(h, 1), &unit, counts, origins, spacings);
        EXPECT_EQ(origins[0], 0.0f);
        EXPECT_EQ(spacings[0], 10.0f);
        xolFileClose(f);
        xolHeaderDestroy(h);
    }
}

}  // namespace
