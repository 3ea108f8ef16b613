#include "input/kvt_access.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <tuple>

#include "input/kvt_current.hpp"
#include "run/process.hpp"
#include "run/units.hpp"
#include "support/test_support.hpp"

namespace {

const char* kModel = R"(TARNEL_BOUSSINESQ_WAVE {
    Simulation_Period {
        Time_step_count    = 1000
        Time_step_interval = 1
        Start_time = 2004, 1, 1, 0, 0, 0
        Precise = 0.1234567890123
    }
    Bathymetry_Selection {
        Hot_Start = 1
        Cold = FALSE
        DATA_FILE {
            File_name = file("data/bathy.xol2")
            Title = "Bay \"north\""
            Item_Count = 2.5
        }
    }
    Sponge { Width = 10 }
    Sponge { Width = 20 }
}
)";

class AccessLayer : public testing::Test {
protected:
    bwtest::TempDir dir;
    std::string path = dir / "model.bw";
    KvtHandle file = 0;
    KvtHandle target = 0;
    void SetUp() override {
        unsetenv("TRNLIB_LOG_NOPATH");
        bwtest::WriteFile(path, kModel);
        int status = -5;
        file = KvtOpenFile(path, true, &status);
        ASSERT_EQ(status, 0);
        target = KvtOpenTarget(file, "TARNEL_BOUSSINESQ_WAVE");
    }
    void TearDown() override {
        kvtClose(&file);
        if (gKvtAccess.logUnit > 0) ReleaseUnit(gKvtAccess.logUnit);
        gKvtAccess = KvtAccessState{};
    }
    // The last n lines of the log.
    std::vector<std::string> LogTail(size_t n) {
        FlushUnits();
        const auto lines = bwtest::ReadLines(dir / "model.log");
        return {lines.end() - static_cast<long>(std::min(n, lines.size())), lines.end()};
    }
};

// Each getter takes the value in its own width; an absent key keeps the value
// with status 1; every value is echoed under its section, defaults marked.
TEST_F(AccessLayer, ValuesDefaultsAndTheirEcho) {
    const KvtHandle period = KvtOpenSection(target, "Simulation_Period");
    int32_t count = 0, missing = 7;
    double dt = 0.0;
    float precise = 0.0f;
    int32_t start[6] = {};
    double absent[2] = {1.5, 2.0};
    int status = -5;
    KvtGetInteger(period, "Time_step_count", count, 1, 1, &status);
    EXPECT_EQ(status, 0);
    KvtGetDouble(period, "Time_step_interval", dt);
    KvtGetInteger(period, "Warm_up_period", missing, 1, 1, &status);
    EXPECT_EQ(status, 1);
    KvtGetReal(period, "Precise", precise);
    KvtGetIntegerList(period, "Start_time", start, 6);
    KvtGetDoubleList(period, "Reference", absent, 2);
    EXPECT_EQ(std::make_tuple(count, dt, missing, precise, start[0], start[2]),
              std::make_tuple(1000, 1.0, 7, 0.1234567890123f, 2004, 1));
    EXPECT_EQ(LogTail(7),
              (std::vector<std::string>{"Section: Simulation_Period " + std::string(43, '-'),
                                        "    Time_step_count : 1000", "    Time_step_interval : 1",
                                        "    Warm_up_period : 7 (default)",
                                        "    Precise : 0.123456", "    Start_time : 2004 1 1 0 0 0",
                                        "    Reference : 1.5 2 (default)"}));
}

// Logicals from words or integers; texts with escaped quotes, cut to a
// width; file names to full paths padded to a width, echoed without their
// folder when TRNLIB_LOG_NOPATH is set; deeper sections echo further in.
TEST_F(AccessLayer, LogicalsTextsAndFileNames) {
    const KvtHandle bathy = KvtOpenSection(target, "Bathymetry_Selection");
    bool hot = false, cold = true, deflt = true;
    KvtGetLogical(bathy, "Hot_Start", hot);
    KvtGetLogical(bathy, "Cold", cold);
    KvtGetLogical(bathy, "Absent", deflt);
    EXPECT_TRUE(hot);
    EXPECT_FALSE(cold);
    EXPECT_EQ(LogTail(3), (std::vector<std::string>{"    Hot_Start : True", "    Cold : False",
                                                    "    Absent : True (default)"}));

    const KvtHandle data = KvtOpenSection(bathy, "DATA_FILE");
    const std::string full = (dir.path / "data/bathy.xol2").string();
    std::string name, title, bare, fallback = "/keep/the/default.xol2";
    KvtGetFilename(data, "File_name", name, 256);
    KvtGetString(data, "Title", title);
    setenv("TRNLIB_LOG_NOPATH", "1", 1);
    KvtGetFilename(data, "File_name", bare);
    KvtGetFilename(data, "Other", fallback);
    unsetenv("TRNLIB_LOG_NOPATH");
    EXPECT_EQ(name, full + std::string(256 - full.size(), ' '));
    EXPECT_EQ(std::make_tuple(title, bare, fallback),
              std::make_tuple("Bay \"north\"", full, "/keep/the/default.xol2"));
    EXPECT_EQ(LogTail(5),
              (std::vector<std::string>{"  Section: DATA_FILE " + std::string(49, '-'),
                                        "      File_name : " + full, "      Title : Bay \"north\"",
                                        "      File_name : bathy.xol2",
                                        "      Other : /keep/the/default.xol2 (default)"}));
    KvtGetString(data, "Title", title, 6);
    EXPECT_EQ(title, "Bay \"n");
}

// Instances of a section are told apart; a missing one, a missing target or
// a missing file gives status -1 and no handle when a status is given.
TEST_F(AccessLayer, SectionInstancesAndMissingParts) {
    int32_t first = 0, second = 0;
    KvtGetInteger(KvtOpenSection(target, "Sponge"), "Width", first);
    KvtGetInteger(KvtOpenSection(target, "Sponge", 2), "Width", second);
    EXPECT_EQ(first, 10);
    EXPECT_EQ(second, 20);
    int status = 0;
    EXPECT_EQ(KvtOpenSection(target, "Sponge", 3, &status), 0u);
    EXPECT_EQ(status, -1);
    status = 0;
    EXPECT_EQ(KvtOpenTarget(file, "NOT_THERE", 1, &status), 0u);
    EXPECT_EQ(status, -1);
    status = 0;
    EXPECT_EQ(KvtOpenFile("/no/such/model.bw", true, &status), 0u);
    EXPECT_EQ(status, -1);
    testing::internal::CaptureStdout();
    EXPECT_EXIT(KvtOpenFile("/no/such/model.bw", false), testing::ExitedWithCode(1), "");
    testing::internal::GetCapturedStdout();
}

// The current-section face walks down and back up; a value of the wrong kind
// is left as it was, with the library's code, and the next key reads cleanly;
// a given default replaces the value first; a failed open keeps the node.
TEST_F(AccessLayer, CurrentSectionFaceWalksBackToTheParent) {
    KvtUseFile(file);
    KvtOpenTarget("TARNEL_BOUSSINESQ_WAVE");
    KvtOpenSection("Bathymetry_Selection");
    KvtOpenSection("DATA_FILE");
    int32_t items = 3;
    int status = 0;
    KvtGetInteger("Item_Count", items, 1, 1, nullptr, &status);  // 2.5 is no integer
    EXPECT_EQ(items, 3);
    EXPECT_NE(status, 0);
    EXPECT_NE(status, 1);
    EXPECT_EQ(LogTail(1).front(), "      Item_Count :");
    KvtGetInteger("Item_Count", items, 1, 2, nullptr, &status);  // no second parameter
    EXPECT_EQ(status, 1);
    KvtCloseSection();
    bool hot = false;
    const bool fallback = false;
    KvtGetLogical("Hot_Start", hot, 1, 1, &fallback, &status);
    EXPECT_TRUE(hot);
    EXPECT_EQ(status, 0);
    KvtCloseSection();
    KvtOpenSection("Simulation_Period");
    const int32_t none = -4;
    int32_t count = 0;
    KvtGetInteger("Time_step_count", count, 1, 1, &none);
    EXPECT_EQ(count, 1000);
    KvtGetInteger("Missing_key", count, 1, 1, &none);
    EXPECT_EQ(count, -4);
    KvtOpenSection("Nested", kKvtNoNumber, &status);
    EXPECT_EQ(status, -1);
    KvtGetInteger("Time_step_count", count);
    EXPECT_EQ(count, 1000);
}

// Numbered sections and the log beside a parameter file, dotted folders too.
TEST(AccessNames, NumberedSectionsAndLogNames) {
    EXPECT_EQ(NumberedSectionName("MESH", kKvtNoNumber), "MESH");
    EXPECT_EQ(NumberedSectionName("MESH  ", 0), "MESH_0");
    EXPECT_EQ(NumberedSectionName("MESH", -3), "MESH_M3");
    EXPECT_EQ(LogFileName("runs/model.bw"), "runs/model.log");
    EXPECT_EQ(LogFileName("a.b/model.v2.bw"), "a.b/model.v2.log");
    EXPECT_EQ(LogFileName("./model"), "./model.log");
}

}  // namespace
