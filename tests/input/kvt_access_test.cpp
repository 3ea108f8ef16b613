#include "input/kvt_access.hpp"

#include <gtest/gtest.h>

#include <cstdlib>

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
    std::vector<std::string> Log() {
        FlushUnits();
        return bwtest::ReadLines(dir / "model.log");
    }
};

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
    KvtGetDouble(period, "Time_step_interval", dt);  // an integer read as a real
    KvtGetInteger(period, "Warm_up_period", missing, 1, 1, &status);
    EXPECT_EQ(status, 1);
    KvtGetReal(period, "Precise", precise);
    KvtGetIntegerList(period, "Start_time", start, 6);
    KvtGetDoubleList(period, "Reference", absent, 2);
    EXPECT_EQ(count, 1000);
    EXPECT_EQ(dt, 1.0);
    EXPECT_EQ(missing, 7);
    EXPECT_EQ(precise, 0.1234567890123f);  // stored rounded to 32 bits
    EXPECT_EQ(start[0], 2004);
    EXPECT_EQ(start[2], 1);

    auto log = Log();
    ASSERT_GE(log.size(), 13u);
    EXPECT_EQ(log[log.size() - 7], "Section: Simulation_Period " + std::string(43, '-'));
    EXPECT_EQ(log[log.size() - 6], "    Time_step_count : 1000");
    EXPECT_EQ(log[log.size() - 5], "    Time_step_interval : 1");
    EXPECT_EQ(log[log.size() - 4], "    Warm_up_period : 7 (default)");
    EXPECT_EQ(log[log.size() - 3],
              "    Precise : 0.123456");  // the value as read, through the formatter
    EXPECT_EQ(log[log.size() - 2], "    Start_time : 2004 1 1 0 0 0");
    EXPECT_EQ(log[log.size() - 1], "    Reference : 1.5 2 (default)");
}

TEST_F(AccessLayer, LogicalsTextsAndFileNames) {
    const KvtHandle bathy = KvtOpenSection(target, "Bathymetry_Selection");
    bool hot = false, cold = true, deflt = true;
    KvtGetLogical(bathy, "Hot_Start", hot);  // an integer stands for a logical
    KvtGetLogical(bathy, "Cold", cold);
    KvtGetLogical(bathy, "Absent", deflt);
    EXPECT_TRUE(hot);
    EXPECT_FALSE(cold);

    const KvtHandle data = KvtOpenSection(bathy, "DATA_FILE");
    std::string name, title, fixed;
    KvtGetFilename(data, "File_name", name, 256);
    KvtGetString(data, "Title", title);
    KvtGetString(data, "Title", fixed, 6);
    EXPECT_EQ(name.size(), 256u);  // blank-padded to the caller's width
    EXPECT_EQ(std::string(name.c_str(), name.find_last_not_of(' ') + 1),
              (dir.path / "data/bathy.xol2").string());
    EXPECT_EQ(title, "Bay \"north\"");
    EXPECT_EQ(fixed, "Bay \"n");

    auto log = Log();
    const size_t n = log.size();
    EXPECT_EQ(log[n - 9], "    Hot_Start : True");
    EXPECT_EQ(log[n - 8], "    Cold : False");
    EXPECT_EQ(log[n - 7], "    Absent : True (default)");
    EXPECT_EQ(log[n - 4], "  Section: DATA_FILE " + std::string(49, '-'));  // indented by level
    EXPECT_EQ(log[n - 3], "      File_name : " + (dir.path / "data/bathy.xol2").string());
    EXPECT_EQ(log[n - 2], "      Title : Bay \"north\"");
}

TEST_F(AccessLayer, FileNamesEchoWithoutFoldersOnRequest) {
    setenv("TRNLIB_LOG_NOPATH", "1", 1);
    const KvtHandle data =
        KvtOpenSection(KvtOpenSection(target, "Bathymetry_Selection"), "DATA_FILE");
    std::string name, fallback = "/keep/the/default.xol2";
    KvtGetFilename(data, "File_name", name);
    KvtGetFilename(data, "Other", fallback);
    unsetenv("TRNLIB_LOG_NOPATH");
    EXPECT_EQ(name, (dir.path / "data/bathy.xol2").string());  // the caller keeps the path
    auto log = Log();
    EXPECT_EQ(log[log.size() - 2], "      File_name : bathy.xol2");
    EXPECT_EQ(log.back(), "      Other : /keep/the/default.xol2 (default)");
}

TEST_F(AccessLayer, AWrongKindLeavesTheValueAndSpoilsNothingAfter) {
    const KvtHandle data =
        KvtOpenSection(KvtOpenSection(target, "Bathymetry_Selection"), "DATA_FILE");
    int32_t count = 3;
    int status = 0;
    KvtGetInteger(data, "Item_Count", count, 1, 1, &status);  // 2.5 is no integer
    EXPECT_EQ(count, 3);
    EXPECT_NE(status, 0);
    EXPECT_NE(status, 1);
    KvtGetInteger(data, "Item_Count", count, 1, 2, &status);  // no second parameter
    EXPECT_EQ(status, 1);
    std::string title;
    KvtGetString(data, "Title", title, 0, 1, 1, &status);
    EXPECT_EQ(status, 0);  // the error of the key before does not linger
    EXPECT_EQ(title, "Bay \"north\"");
    auto log = Log();
    EXPECT_EQ(log[log.size() - 3], "      Item_Count :");
}

TEST_F(AccessLayer, SectionInstancesAndMissingSections) {
    int32_t first = 0, second = 0;
    KvtGetInteger(KvtOpenSection(target, "Sponge"), "Width", first);
    KvtGetInteger(KvtOpenSection(target, "Sponge", 2), "Width", second);
    EXPECT_EQ(first, 10);
    EXPECT_EQ(second, 20);
    int status = 0;
    EXPECT_EQ(KvtOpenSection(target, "Sponge", 3, &status), 0u);
    EXPECT_EQ(status, -1);
    EXPECT_EQ(KvtOpenTarget(file, "NOT_THERE", 1, &status), 0u);
    EXPECT_EQ(status, -1);
    EXPECT_EXIT(KvtOpenSection(target, "Porosity"), testing::ExitedWithCode(1), "");
    EXPECT_EXIT(KvtOpenTarget(file, "OTHER"), testing::ExitedWithCode(1), "");
}

TEST_F(AccessLayer, CurrentSectionFaceWalksBackToTheParent) {
    KvtUseFile(file);
    KvtOpenTarget("TARNEL_BOUSSINESQ_WAVE");
    KvtOpenSection("Bathymetry_Selection");
    KvtOpenSection("DATA_FILE");
    int32_t items = 0;
    int status = 0;
    KvtGetInteger("Item_Count", items, 1, 1, nullptr, &status);
    EXPECT_NE(status, 0);
    KvtCloseSection();  // back in Bathymetry_Selection
    bool hot = false;
    const bool fallback = false;
    KvtGetLogical("Hot_Start", hot, 1, 1, &fallback, &status);
    EXPECT_TRUE(hot);
    EXPECT_EQ(status, 0);
    KvtCloseSection();  // back in the target
    KvtOpenSection("Simulation_Period");
    const int32_t none = -4;
    int32_t count = 0;
    KvtGetInteger("Time_step_count", count, 1, 1, &none);
    EXPECT_EQ(count, 1000);
    KvtGetInteger("Missing_key", count, 1, 1, &none);
    EXPECT_EQ(count, -4);  // the default given replaces the value before the look-up
    KvtOpenSection("Nested", kKvtNoNumber, &status);
    EXPECT_EQ(status, -1);  // the current node stays
    KvtGetInteger("Time_step_count", count);
    EXPECT_EQ(count, 1000);
}

TEST(AccessNames, NumberedSectionsAndLogNames) {
    EXPECT_EQ(NumberedSectionName("MESH", kKvtNoNumber), "MESH");
    EXPECT_EQ(NumberedSectionName("MESH  ", 0), "MESH_0");
    EXPECT_EQ(NumberedSectionName("MESH", -3), "MESH_M3");
    EXPECT_EQ(LogFileName("runs/model.bw"), "runs/model.log");
    EXPECT_EQ(LogFileName("runs/model"), "runs/model.log");
    EXPECT_EQ(LogFileName("a.b/model.v2.bw"), "a.b/model.v2.log");
    EXPECT_EQ(LogFileName("./model"), "./model.log");
}

TEST(AccessFiles, MissingFileWithAndWithoutStatus) {
    int status = 0;
    EXPECT_EQ(KvtOpenFile("/no/such/model.bw", true, &status), 0u);
    EXPECT_EQ(status, -1);
    testing::internal::CaptureStdout();
    EXPECT_EXIT(KvtOpenFile("/no/such/model.bw", false), testing::ExitedWithCode(1), "");
    testing::internal::GetCapturedStdout();
}

}  // namespace
