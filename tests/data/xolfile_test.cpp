#include "data/xolfile.hpp"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cmath>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <limits>
#include <tuple>
#include <vector>

#include "run/messages.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"

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
    const struct {
        const char* name;
        int code;
        const char* text;
    } opens[] = {
        {"shifted.xol1", kXolBadAxis,
         "Invalid spatial axis file: %: item 2 \"b\" lies on other axes than item 1"},
        {"type4.xol0", kXolBadFileType,
         "Invalid type of XOL file file: %: file type 4, where this engine reads type 1"},
        {"e.nc", kXolBadItemNumber, "Invalid item number file: %: the file holds no dynamic items"},
        {"c.nc", kXolBadTimeAxis,
         "Invalid time axis file: %: time axis type 2 is neither relative (1) nor calendar (3)"},
    };
    for (const auto& c : opens) {
        const XolFile opened = XolOpenRead(dir / c.name, &status);
        EXPECT_EQ(status, c.code) << c.name;
        EXPECT_EQ(opened.lastErrorText, Filled(c.text, dir / c.name));
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

// A full disk for this process: files end at `bytes`, and a write beyond
// fails instead of raising its signal.
void LimitFileSize(rlim_t bytes) {
    if (bytes == RLIM_INFINITY) return;
    signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{bytes, bytes};
    setrlimit(RLIMIT_FSIZE, &limit);
}

// A line file of 1024 points written step by step with the stop forms
// (flushed after each step when flush is set) on a disk that holds `bytes`.
void FillTheDisk(const std::string& path, int steps, bool flush, rlim_t bytes) {
    LimitFileSize(bytes);
    XolFile f = XolCreateHeader("Line", 1, 1);
    XolSetItem(f, 1, 100078, "Level", 1000);
    XolSetAxis(f, 1, 1.0f, 0.0f, 1024);
    XolSetCalendarAxis(f, 1.0, "2004-01-01 00:00:00");
    XolCreateFile(f, path);
    const std::vector<float> values(1024, 1.0f);
    for (int s = 0; s < steps; ++s) {
        XolWriteDynamic(f, values.data());
        if (flush) XolFlush(f);
    }
    XolClose(f);
}

// A stop that comes from a data file keeps its first words, then names the
// file and the reason: a file missing, read past its end, too large for the
// machine's memory (a NetCDF-4 file declares it without holding it), created
// in a missing folder, and a disk that fills up under a write, a flush or
// the close. The status forms give the same text in the record, and stop
// nothing.
TEST(DataFileLayer, StopsNameTheFileAndTheReason) {
    bwtest::TempDir dir;
    setenv("TRF", "HUD", 1);  // stop texts go to standard error, where the death test reads them
    const std::string one = dir / "one.xol0";
    bwtest::WriteSeriesFile(one, "2004-01-01 00:00:00", 1.0, {{1.0f}});
    bwtest::WriteFile(dir / "huge.cdl",
                      "netcdf h {\ndimensions:\n x = 1000000000 ;\n y = 1000000000 ;\n"
                      "variables:\n float z(y, x) ;\n}\n");
    ASSERT_EQ(
        bwtest::RunProgram({"/usr/bin/ncgen", "-4", "-o", "huge.nc", "huge.cdl"}, dir.path.string())
            .exitCode,
        0);
    const std::string huge =
        "Unable to allocate memory: an item of 1000000000 x 1000000000 points "
        "in " +
        dir / "huge.nc" + " needs 4e\\+09 GB, the machine has";
    int status = 0;
    XolFile f = XolOpenRead(dir / "huge.nc", &status);
    EXPECT_EQ(status, kXolNoMemory);
    EXPECT_TRUE(testing::internal::RE::PartialMatch(f.lastErrorText, huge)) << f.lastErrorText;
    f = XolOpenRead(dir / "absent.xol2", &status);
    EXPECT_EQ(f.lastErrorText,
              "XOL open error on " + dir / "absent.xol2" + ": no such file or directory");

    EXPECT_EXIT(XolOpenRead(dir / "absent.xol2"), testing::ExitedWithCode(1),
                "XOL open error on .*absent.xol2: no such file or directory\n");
    EXPECT_EXIT(XolOpenRead(dir / "huge.nc"), testing::ExitedWithCode(1), huge);
    EXPECT_EXIT(
        {
            XolFile series = XolOpenRead(one);
            float v = 0.0f;
            XolReadDynamic(series, &v);
            XolReadDynamic(series, &v);
        },
        testing::ExitedWithCode(1),
        "TRNXOL Error: Unable to read dynamic item: .*one.xol0: no more data: the file holds 1 "
        "step of 1 item\n");
    EXPECT_EXIT(
        {
            XolFile made = XolCreateHeader("t", 1, 0);
            XolSetItem(made, 1, 999, "a", 0);
            XolCreateFile(made, dir / "no/folder.xol0");
        },
        testing::ExitedWithCode(1),
        "Unable to create file for .*no/folder.xol0: no such file or directory\n");
    EXPECT_EXIT(FillTheDisk(dir / "flushed.xol1", 8, true, 40000), testing::ExitedWithCode(1),
                "Flush error: .*flushed.xol1: file too large\n");
    EXPECT_EXIT(FillTheDisk(dir / "written.xol1", 8, false, 40000), testing::ExitedWithCode(1),
                "TRNXOL Error: Unable to write dynamic item: .*written.xol1: file too large\n");
    // The step of a file written without a flush goes to disk as it closes.
    FillTheDisk(dir / "whole.xol1", 1, false, RLIM_INFINITY);
    const rlim_t whole = std::filesystem::file_size(dir / "whole.xol1");
    EXPECT_EXIT(FillTheDisk(dir / "closed.xol1", 1, false, whole - 1024),
                testing::ExitedWithCode(1),
                "TRNXOL Error: Unable to close file: .*closed.xol1: file too large\n");
    unsetenv("TRF");
}

// A value that is not a finite number stops the reading of a map at its
// place (j,k), and of a line file checked at setup at its step and point;
// the delete value, huge values and items the reader does not want pass.
TEST(DataFileLayer, ValuesThatAreNoNumbersStopNamingTheirPlace) {
    bwtest::TempDir dir;
    setenv("TRF", "HUD", 1);
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const float inf = std::numeric_limits<float>::infinity();
    bwtest::MapSpec grid;
    grid.J = 3, grid.K = 2;
    std::vector<float> map = bwtest::Constant(grid, 3.0e38f);
    map[1] = kDeleteValue;
    bwtest::WriteMapFile(dir / "good.xol2", grid, map);
    map[1 * 4 + 3] = -inf;
    bwtest::WriteMapFile(dir / "bad.xol2", grid, map);
    std::vector<float> values(12);
    ReadGridFile2D(dir / "good.xol2", 1, values.data(), {1.0f, 1.0f, 3, 2});
    EXPECT_EQ(values[1], kDeleteValue);
    EXPECT_EXIT(ReadGridFile2D(dir / "bad.xol2", 1, values.data(), {1.0f, 1.0f, 3, 2}),
                testing::ExitedWithCode(1),
                "XOL data holds a value that is not a finite number: .*bad.xol2, item 1 "
                "\"Bathymetry\", point \\(3,1\\)\n");

    // Three steps of three points; item 2 (not checked) holds a NaN from the start.
    std::vector<std::vector<std::vector<float>>> line(
        2, std::vector<std::vector<float>>(3, std::vector<float>(3, 1.0f)));
    line[1][0][0] = nan;
    line[0][2][1] = inf;
    bwtest::WriteLineFile(dir / "line.xol1", "2004-01-01 00:00:00", 1.0, 1.0f, line, 0,
                          {"Level", "Deep"});
    XolCheckFiniteSteps(dir / "line.xol1", 1, 0, 1);
    EXPECT_EXIT(XolCheckFiniteSteps(dir / "line.xol1", 1, 1, 2), testing::ExitedWithCode(1),
                "XOL data holds a value that is not a finite number: .*line.xol1, item 1 "
                "\"Level\", step 2, point 1\n");
    EXPECT_EXIT(XolCheckFiniteSteps(dir / "line.xol1", 2, 0, 0), testing::ExitedWithCode(1),
                "line.xol1, item 2 \"Deep\", step 0, point 0\n");
    unsetenv("TRF");
}

}  // namespace
