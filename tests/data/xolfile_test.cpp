#include "data/xolfile.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <vector>

#include "support/log_capture.hpp"

namespace {

// A map file of nItems items on a 4 x 3 grid, steps steps, an optional static item.
std::string WriteMap(const bwtest::TempDir& dir, const std::string& name, int nItems, int steps,
                     bool withStatic, float dx = 2.0f) {
    const std::string path = dir / name;
    XolFile f = XolCreateHeader("Bay map", nItems, 2, {.appTitle = "bw", .version = 1});
    for (int n = 1; n <= nItems; ++n) XolSetItem(f, n, 100078, "Level " + std::to_string(n), 1000);
    XolSetAxis(f, 1, dx, 0.0f, 4);
    XolSetAxis(f, 2, 3.0f, 0.0f, 3);
    XolSetDataType(f, 11);
    XolSetCalendarAxis(f, 0.25, "2004-01-01 00:00:00");
    XolSetMisc(f, 4, -7.5f);
    XolSetMisc(f, 8, 99.0f);  // passed over
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
    EXPECT_EQ(f.mode, 3);
    EXPECT_EQ(f.noTimeSteps, steps);
    EXPECT_EQ(f.dynamicItems[0].minimum, 10.0);
    return path;
}

TEST(DataFileLayer, WrittenFileOpensWithItsRecordFilled) {
    bwtest::TempDir dir;
    const std::string path = WriteMap(dir, "map.xol2", 2, 3, true);
    int status = -1;
    XolFile f = XolOpenRead(path, &status);
    ASSERT_EQ(status, 0);
    EXPECT_EQ(f.mode, 1);
    EXPECT_EQ(f.title, "Bay map");
    EXPECT_EQ(f.appTitle, "bw");
    EXPECT_EQ(f.dimension, 2);
    EXPECT_EQ(f.noDynamicItems, 2);
    EXPECT_EQ(f.noStaticItems, 1);
    EXPECT_EQ(f.dataType, 11);
    EXPECT_EQ(f.misc[3], -7.5f);
    EXPECT_EQ(f.misc[0], kDeleteValue);
    EXPECT_EQ(f.timeAxisType, 3);
    EXPECT_EQ(f.startDateTime, "2004-01-01 00:00:00");
    EXPECT_EQ(f.noTimeSteps, 3);
    EXPECT_EQ(f.axes[0].count, 4);
    EXPECT_EQ(f.axes[1].spacing, 3.0f);
    EXPECT_EQ(f.dynamicItems[1].name, "Level 2");
    EXPECT_EQ(f.dynamicItems[1].baseUnit, 1000);
    EXPECT_EQ(f.projection, "NON-UTM");
    // Statics first: the first dynamic read passes over them.
    EXPECT_EQ(f.position, -1);
    std::vector<float> values(12);
    XolSkipDynamic(f);
    XolReadDynamic(f, values.data());
    EXPECT_EQ(values[2], 21.0f);
    EXPECT_EQ(f.position, 3);
    XolReadStatic(f, values.data(), &status);
    EXPECT_EQ(status, kXolStaticAfterDynamic);
    XolClose(f);

    f = XolOpenRead(path);
    XolReadStatic(f, values.data());
    EXPECT_EQ(values[11], -12.0f);
    EXPECT_EQ(f.position, -2);
    XolClose(f);
}

TEST(DataFileLayer, SummaryInTheLog) {
    bwtest::TempDir dir;
    bwtest::LogCapture log;
    XolFile many = XolOpenRead(WriteMap(dir, "a.xol2", 1, 3, false));
    XolPrintSummary(many);
    XolClose(many);
    XolFile one = XolOpenRead(WriteMap(dir, "b.xol2", 1, 1, false));
    XolPrintSummary(one);
    XolClose(one);
    const auto lines = log.Lines();
    ASSERT_EQ(lines.size(), 21u);
    EXPECT_EQ(lines[0], std::string(27, '-') + " Data File Summary " + std::string(27, '-'));
    EXPECT_EQ(lines[1], "  Data origin: bw");
    EXPECT_EQ(lines[2], "  Title  : Bay map");
    EXPECT_EQ(lines[3], "  Delete : -1.000E-30");  // the 32-bit value widened
    EXPECT_EQ(lines[5], "  time     3       0.25 2004-01-01 00:00:00");
    EXPECT_EQ(lines[6], "     1     4          2            0   meter");
    EXPECT_EQ(lines[9].substr(0, 44), "  Level 1              Surface Elevation    ");
    EXPECT_EQ(lines[9].substr(lines[9].size() - 14), "       0 meter");
    EXPECT_EQ(lines[10], std::string(70, '-'));
    EXPECT_EQ(lines[16].substr(0, 6), "     1");  // one step: no time row
}

TEST(DataFileLayer, FailuresGiveTheirCodes) {
    bwtest::TempDir dir;
    int status = 0;
    XolFile f = XolOpenRead(dir / "absent.xol2", &status);
    EXPECT_EQ(status, kXolOpenFailed);

    f = XolCreateHeader("t", 1, 0);
    XolSetItem(f, 2, 999, "x", 0, &status);
    EXPECT_EQ(status, kXolBadItemNumber);
    XolSetItem(f, 1, 999, "Counter", 0);
    XolCreateFile(f, dir / "s.xol0");
    const float v = 1.0f;
    XolWriteDynamic(f, &v);
    const int position = f.position;
    XolWriteStatic(f, &v, 999, "late", 0, &status);
    EXPECT_EQ(status, kXolStaticWriteAfterDynamic);
    EXPECT_EQ(f.position, position);
    XolClose(f);

    // A second item whose axis origin differs in the last bit from the first's.
    XolHandle h = 0, file = 0;
    xolHeaderCreate(1, "t", "bw", 0, 2, 1, &h);
    xolSetItemInfo(xolItemD(h, 1), 999, "a", 0, 1);
    xolSetItemAxisEqD1(xolItemD(h, 1), 1000, 3, 1.0f, 1.0f);
    xolSetItemInfo(xolItemD(h, 2), 999, "b", 0, 1);
    xolSetItemAxisEqD1(xolItemD(h, 2), 1000, 3, std::nextafter(1.0f, 2.0f), 1.0f);
    xolFileCreate(dir / "shifted.xol1", h, &file);
    xolFileClose(file);
    xolHeaderDestroy(h);
    XolOpenRead(dir / "shifted.xol1", &status);
    EXPECT_EQ(status, kXolBadAxis);
    EXPECT_EQ(XolErrorText(109), "Unknown error: 109");

    // A file of another file type, one without items, one with an unknown kind of time axis.
    XolHeaderOptions type4;
    type4.fileTypeFlag = true;
    f = XolCreateHeader("t", 1, 0, type4);
    XolSetItem(f, 1, 999, "a", 0);
    XolCreateFile(f, dir / "type4.xol0");
    XolClose(f);
    XolOpenRead(dir / "type4.xol0", &status);
    EXPECT_EQ(status, kXolBadFileType);
    const struct {
        const char* name;
        const char* cdl;
        int code;
    } files[] = {{"empty", "netcdf e {\ndimensions:\n x = 2 ;\n}\n", kXolBadItemNumber},
                 {"clock",
                  "netcdf c {\ndimensions:\n time = UNLIMITED ;\nvariables:\n float a(time) ;\n"
                  "// global attributes:\n :time_axis_type = 2 ;\ndata:\n a = 1, 2 ;\n}\n",
                  kXolBadTimeAxis}};
    for (const auto& c : files) {
        bwtest::WriteFile(dir / (std::string(c.name) + ".cdl"), c.cdl);
        ASSERT_EQ(bwtest::RunProgram({"/usr/bin/ncgen", "-5", "-o", std::string(c.name) + ".nc",
                                      std::string(c.name) + ".cdl"},
                                     dir.path.string())
                      .exitCode,
                  0);
        XolOpenRead(dir / (std::string(c.name) + ".nc"), &status);
        EXPECT_EQ(status, c.code) << c.name;
    }

    setenv("TRF", "HUD", 1);
    EXPECT_EXIT(XolOpenRead(dir / "absent.xol2"), testing::ExitedWithCode(1),
                "XOL open error on .*absent.xol2");
    EXPECT_EXIT(XolSetItem(f, 0, 999, "x", 0), testing::ExitedWithCode(1),
                "TRNXOL Error: Invalid item number");
    unsetenv("TRF");
}

TEST(DataFileLayer, MapsMustLieOnTheModelGrid) {
    bwtest::TempDir dir;
    bwtest::LogCapture log;
    const std::string path = WriteMap(dir, "m.xol2", 3, 1, false);
    std::vector<float> values(12);
    ReadGridFile2D(path, 2, values.data(), {2.0f, 3.0f, 3, 2});
    EXPECT_EQ(values[0], 20.0f);  // the second item stays
    setenv("TRF", "HUD", 1);
    EXPECT_EXIT(ReadGridFile2D(path, 1, values.data(), {2.5f, 3.0f, 3, 2}),
                testing::ExitedWithCode(1), "correct grid spacing \\(x-dir.\\)");
    EXPECT_EXIT(ReadGridFile2D(path, 1, values.data(), {2.0f, 3.0f, 3, 3}),
                testing::ExitedWithCode(1), "correct number of grid points \\(y.dir.\\)");
    EXPECT_EXIT(ReadGridFile1D(path, 1, values.data(), {2.0f, 0.0f, 3, 0}),
                testing::ExitedWithCode(1), "XOL data is not 1D");
    unsetenv("TRF");
}

}  // namespace
