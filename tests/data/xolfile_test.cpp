#include "data/xolfile.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <tuple>
#include <vector>

#include "support/log_capture.hpp"

namespace {

// A map file of nItems items on a 4 x 3 grid, steps steps, an optional static item.
std::string WriteMap(const bwtest::TempDir& dir, const std::string& name, int nItems, int steps,
                     bool withStatic) {
    const std::string path = dir / name;
    XolFile f = XolCreateHeader("Bay map", nItems, 2, {.appTitle = "bw", .version = 1});
    for (int n = 1; n <= nItems; ++n) XolSetItem(f, n, 100078, "Level " + std::to_string(n), 1000);
    XolSetAxis(f, 1, 2.0f, 0.0f, 4);
    XolSetAxis(f, 2, 3.0f, 0.0f, 3);
    XolSetCalendarAxis(f, 0.25, "2004-01-01 00:00:00");
    XolSetMisc(f, 4, -7.5f);
    XolSetProjection(f, "NON-UTM", 0.0, 0.0);
    XolCreateFile(f, path);
    std::vector<float> values(12);
    if (withStatic) {
        for (int i = 0; i < 12; ++i) values[i] = -1.0f - i;
        XolWriteStatic(f, values.data(), 100079, "Bathymetry", 1000);
    }
    for (int s = 0; s < steps; ++s)
        for (int n = 1; n <= nItems; ++n) {
            for (int i = 0; i < 12; ++i) values[i] = 10.0f * n + s + 0.5f * i;
            XolWriteDynamic(f, values.data());
        }
    XolClose(f);
    EXPECT_EQ(std::make_pair(f.noTimeSteps, f.dynamicItems[0].minimum),
              std::make_pair(steps, 10.0));
    return path;
}

// What was written comes back in the record at open; a first dynamic read
// passes over the statics, and no static is read after the dynamic items.
// The summary in the log: origin, title, the delete value as written in 32
// bits, the time row (only for more than one step) and the axes.
TEST(DataFileLayer, WrittenFileOpensWithItsRecordAndSumsItselfUpInTheLog) {
    bwtest::TempDir dir;
    bwtest::LogCapture log;
    int status = -1;
    XolFile f = XolOpenRead(WriteMap(dir, "map.xol2", 2, 3, true), &status);
    ASSERT_EQ(status, 0);
    EXPECT_EQ(std::make_tuple(f.noStaticItems, f.timeAxisType, f.dynamicItems[1].name, f.misc[3]),
              std::make_tuple(1, 3, std::string("Level 2"), -7.5f));
    XolPrintSummary(f);
    std::vector<float> values(12);
    XolSkipDynamic(f);
    XolReadDynamic(f, values.data());
    EXPECT_EQ(values[2], 21.0f);
    XolReadStatic(f, values.data(), &status);
    EXPECT_EQ(status, kXolStaticAfterDynamic);
    XolClose(f);
    XolFile one = XolOpenRead(WriteMap(dir, "one.xol2", 1, 1, false));
    XolPrintSummary(one);
    XolClose(one);
    const auto lines = log.Lines();
    ASSERT_EQ(lines.size(), 22u);
    EXPECT_EQ(std::vector<std::string>(lines.begin() + 1, lines.begin() + 7),
              (std::vector<std::string>{"  Data origin: bw", "  Title  : Bay map",
                                        "  Delete : -1.000E-30",
                                        "  Axis  Sets   Interval  Axis origin  Unit",
                                        "  time     3       0.25 2004-01-01 00:00:00",
                                        "     1     4          2            0   meter"}));
    EXPECT_EQ(lines[17].substr(0, 6), "     1");  // one step: no time row
}

// Each failure gives its own code with a status (a static after the dynamic
// items, axes that differ in the last bit, another file type, no items, an
// unknown time axis) and stops the run with its text without one.
TEST(DataFileLayer, FailuresGiveTheirCodesOrStop) {
    bwtest::TempDir dir;
    bwtest::LogCapture log;
    int status = 0;
    XolFile f = XolCreateHeader("t", 1, 0);
    XolSetItem(f, 1, 999, "Counter", 0);
    XolCreateFile(f, dir / "s.xol0");
    const float v = 1.0f;
    XolWriteDynamic(f, &v);
    XolWriteStatic(f, &v, 999, "late", 0, &status);
    EXPECT_EQ(status, kXolStaticWriteAfterDynamic);
    XolClose(f);
    EXPECT_EQ(XolErrorText(109), "Unknown error: 109");

    XolHandle h = 0, file = 0;
    xolHeaderCreate(1, "t", "bw", 0, 2, 1, &h);
    for (int item : {1, 2}) {
        xolSetItemInfo(xolItemD(h, item), 999, item == 1 ? "a" : "b", 0, 1);
        xolSetItemAxisEqD1(xolItemD(h, item), 1000, 3,
                           item == 1 ? 1.0f : std::nextafter(1.0f, 2.0f), 1.0f);
    }
    xolFileCreate(dir / "shifted.xol1", h, &file);
    xolFileClose(file);
    xolHeaderDestroy(h);
    f = XolCreateHeader("t", 1, 0, {.fileTypeFlag = true, .appTitle = "", .version = 0});
    XolSetItem(f, 1, 999, "a", 0);
    XolCreateFile(f, dir / "type4.xol0");
    XolClose(f);
    for (const auto& [name, cdl] : {std::pair{"e", "netcdf e {\ndimensions:\n x = 2 ;\n}\n"},
                                    {"c",
                                     "netcdf c {\ndimensions:\n time = UNLIMITED ;\n"
                                     "variables:\n float a(time) ;\n// global attributes:\n"
                                     " :time_axis_type = 2 ;\ndata:\n a = 1, 2 ;\n}\n"}}) {
        bwtest::WriteFile(dir / "f.cdl", cdl);
        ASSERT_EQ(
            bwtest::RunProgram({"/usr/bin/ncgen", "-5", "-o", std::string(name) + ".nc", "f.cdl"},
                               dir.path.string())
                .exitCode,
            0);
    }
    for (const auto& [name, code] : {std::pair{"shifted.xol1", kXolBadAxis},
                                     {"type4.xol0", kXolBadFileType},
                                     {"e.nc", kXolBadItemNumber},
                                     {"c.nc", kXolBadTimeAxis}}) {
        XolOpenRead(dir / name, &status);
        EXPECT_EQ(status, code) << name;
    }

    setenv("TRF", "HUD", 1);  // stop texts go to standard error, where the death test reads them
    EXPECT_EXIT(XolOpenRead(dir / "absent.xol2"), testing::ExitedWithCode(1),
                "XOL open error on .*absent.xol2");
    EXPECT_EXIT(XolSetItem(f, 0, 999, "x", 0), testing::ExitedWithCode(1),
                "TRNXOL Error: Invalid item number");
    // A map is read on the model's grid only, the selected item staying;
    // another spacing or count stops the run naming what differs.
    const std::string path = WriteMap(dir, "m.xol2", 3, 1, false);
    std::vector<float> values(12);
    ReadGridFile2D(path, 2, values.data(), {2.0f, 3.0f, 3, 2});
    EXPECT_EQ(values[0], 20.0f);
    EXPECT_EXIT(ReadGridFile2D(path, 1, values.data(), {2.5f, 3.0f, 3, 2}),
                testing::ExitedWithCode(1), "correct grid spacing \\(x-dir.\\)");
    EXPECT_EXIT(ReadGridFile2D(path, 1, values.data(), {2.0f, 3.0f, 3, 3}),
                testing::ExitedWithCode(1), "correct number of grid points \\(y.dir.\\)");
    unsetenv("TRF");
}

}  // namespace
