// The parameter access layer beyond what every model-file test reads through
// it (values, defaults and their echo): status codes, values of the wrong
// kind, logicals from integers, texts cut to a width, file names echoed
// without their folder, and the current-section face.
#include "input/kvt_access.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <tuple>

#include "input/kvt_current.hpp"
#include "run/units.hpp"
#include "support/test_support.hpp"

namespace {

const char* kModel = R"(TARNEL_BOUSSINESQ_WAVE {
    Simulation_Period {
        Time_step_count = 1000
    }
    Bathymetry_Selection {
        Hot_Start = 1
        DATA_FILE {
            File_name = file("data/bathy.xol2")
            Title = "Bay \"north\""
            Item_Count = 2.5
        }
    }
}
)";

class AccessLayer : public testing::Test {
protected:
    bwtest::TempDir dir;
    KvtHandle file = 0;
    KvtHandle target = 0;
    void SetUp() override {
        bwtest::WriteFile(dir / "model.bw", kModel);
        file = KvtOpenFile(dir / "model.bw", true);
        target = KvtOpenTarget(file, "TARNEL_BOUSSINESQ_WAVE");
    }
    void TearDown() override {
        kvtClose(&file);
        if (gKvtAccess.logUnit > 0) ReleaseUnit(gKvtAccess.logUnit);
        gKvtAccess = KvtAccessState{};
    }
    std::string LastLogLine() {
        FlushUnits();
        return bwtest::ReadLines(dir / "model.log").back();
    }
};

TEST_F(AccessLayer, StatusesKindsWidthsAndFileNames) {
    // A status tells a value taken (0) from an absent key (1), which keeps the value.
    int32_t count = 0, missing = 7;
    int status = -5;
    const KvtHandle period = KvtOpenSection(target, "Simulation_Period");
    KvtGetInteger(period, "Time_step_count", count, 1, 1, &status);
    EXPECT_EQ(std::make_pair(count, status), std::make_pair(1000, 0));
    KvtGetInteger(period, "Warm_up_period", missing, 1, 1, &status);
    EXPECT_EQ(std::make_pair(missing, status), std::make_pair(7, 1));

    // A value of the wrong kind is left as it was, with the library's code,
    // and echoed empty.
    const KvtHandle bathy = KvtOpenSection(target, "Bathymetry_Selection");
    const KvtHandle data = KvtOpenSection(bathy, "DATA_FILE");
    int32_t items = 3;
    KvtGetInteger(data, "Item_Count", items, 1, 1, &status);
    EXPECT_EQ(items, 3);
    EXPECT_TRUE(status != 0 && status != 1) << status;
    EXPECT_EQ(LastLogLine(), "      Item_Count :");

    bool hot = false;
    std::string title, name;
    KvtGetLogical(bathy, "Hot_Start", hot);
    KvtGetString(data, "Title", title, 6);
    setenv("TRNLIB_LOG_NOPATH", "1", 1);
    KvtGetFilename(data, "File_name", name);
    unsetenv("TRNLIB_LOG_NOPATH");
    EXPECT_EQ(
        std::make_tuple(hot, title, name),
        std::make_tuple(true, std::string("Bay \"n"), (dir.path / "data/bathy.xol2").string()));
    EXPECT_EQ(LastLogLine(), "      File_name : bathy.xol2");

    testing::internal::CaptureStdout();
    EXPECT_EXIT(KvtOpenFile("/no/such/model.bw", false), testing::ExitedWithCode(1), "");
    testing::internal::GetCapturedStdout();
}

// The current-section face walks down and back up; a given default replaces
// the value first; a failed open keeps the node.
TEST_F(AccessLayer, CurrentSectionFaceWalksBackToTheParent) {
    KvtUseFile(file);
    KvtOpenTarget("TARNEL_BOUSSINESQ_WAVE");
    KvtOpenSection("Bathymetry_Selection");
    KvtOpenSection("DATA_FILE");
    KvtCloseSection();
    bool hot = false;
    KvtGetLogical("Hot_Start", hot);
    EXPECT_TRUE(hot);
    KvtCloseSection();
    KvtOpenSection("Simulation_Period");
    const int32_t none = -4;
    int32_t count = 0;
    KvtGetInteger("Missing_key", count, 1, 1, &none);
    EXPECT_EQ(count, -4);
    int status = 0;
    KvtOpenSection("Nested", kKvtNoNumber, &status);
    EXPECT_EQ(status, -1);
    KvtGetInteger("Time_step_count", count, 1, 1, &none);
    EXPECT_EQ(count, 1000);
}

// Numbered sections and the log beside a parameter file, dotted folders too.
TEST(AccessNames, NumberedSectionsAndLogNames) {
    EXPECT_EQ(NumberedSectionName("MESH", kKvtNoNumber), "MESH");
    EXPECT_EQ(NumberedSectionName("MESH  ", 0), "MESH_0");
    EXPECT_EQ(NumberedSectionName("MESH", -3), "MESH_M3");
    EXPECT_EQ(LogFileName("a.b/model.v2.bw"), "a.b/model.v2.log");
    EXPECT_EQ(LogFileName("./model"), "./model.log");
}

}  // namespace
