// The parameter access layer beyond what every model-file test reads through
// it (values, defaults and their echo): status codes, values of the wrong
// kind, logicals from integers, texts cut to a width, file names echoed
// without their folder, the current-section face, the refusal of values that
// can't be meant, model files that can't be read, and the warnings of what a
// run left unread.
#include "input/kvt_access.hpp"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cmath>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <tuple>
#include <vector>

#include "input/kvt_current.hpp"
#include "run/units.hpp"
#include "support/log_capture.hpp"
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

// A text as a pattern of the death tests that matches it literally.
std::string Literal(const std::string& text) {
    std::string pattern;
    for (char c : text) {
        if (std::strchr("\\^$.|?*+()[]{}", c) != nullptr) pattern += '\\';
        pattern += c;
    }
    return pattern;
}

const char* kBadValues = R"(TARNEL_BOUSSINESQ_WAVE {
    Level = 1.5
    Simulation_Period {
        Time_step_count = "forty"
        Wide_count = 4294967336
        Time_step_interval = nan
        Start_time = 2004, 1
        Huge = 1e40
        Levels = 0.5, -inf
        Whole = 40
    }
    Bathymetry_Selection {
        Hot_Start = "yes"
        Title = 12
        File_name = true
        Output = "out.nc"
    }
}
)";

// Reads key through the getter named; true when the value is as the plain
// library leaves it: the default kept, or a real that is not finite taken.
bool Get(const std::string& getter, KvtHandle section, const char* key, int n, int* status) {
    int32_t whole = 7;
    double real = 0.0;
    float single = 0.0f;
    bool logical = false;
    std::string text = "x";
    std::vector<int32_t> wholes(n);
    std::vector<double> reals(n);
    if (getter == "KvtGetInteger") KvtGetInteger(section, key, whole, 1, n, status);
    if (getter == "KvtGetDouble") KvtGetDouble(section, key, real, 1, n, status);
    if (getter == "KvtGetReal") KvtGetReal(section, key, single, 1, n, status);
    if (getter == "KvtGetLogical") KvtGetLogical(section, key, logical, 1, n, status);
    if (getter == "KvtGetString") KvtGetString(section, key, text, 0, 1, n, status);
    if (getter == "KvtGetFilename") KvtGetFilename(section, key, text, 0, 1, n, status);
    if (getter == "KvtGetIntegerList") KvtGetIntegerList(section, key, wholes.data(), n, status);
    if (getter == "KvtGetDoubleList") KvtGetDoubleList(section, key, reals.data(), n, status);
    // Only the variable of the getter called can have changed.
    const bool kept = whole == 7 && !logical && text == "x";
    if (getter == "KvtGetDouble") return kept && std::isnan(real);
    if (getter == "KvtGetReal") return kept && std::isinf(single);
    if (getter == "KvtGetDoubleList") return kept && reals[0] == 0.5 && std::isinf(reals[1]);
    if (getter == "KvtGetIntegerList")
        return kept && wholes == std::vector<int32_t>{2004, 1, 0, 0, 0, 0};
    return kept;
}

// Without a status every kind of value that can't be meant stops the run
// with the getter, key, section, line, values as written and what is
// allowed, after the key's echo; with a status the same calls go on as the
// plain library leaves them, with its code.
TEST_F(AccessLayer, ValuesThatCantBeMeantStopTheRunUnlessAStatusIsGiven) {
    bwtest::WriteFile(dir / "bad.bw", kBadValues);
    KvtHandle bad = KvtOpenFile(dir / "bad.bw", false);
    const KvtHandle top = KvtOpenTarget(bad, "TARNEL_BOUSSINESQ_WAVE");
    const KvtHandle period = KvtOpenSection(top, "Simulation_Period");
    const KvtHandle bathy = KvtOpenSection(top, "Bathymetry_Selection");
    // A count neither echoes nor reads.
    EXPECT_EQ(KvtParamCount(period, "Start_time") * 10 + KvtParamCount(period, "Absent"), 20);
    EXPECT_FALSE(kvtIsRead(kvtKeywordPeek(period, "Start_time", 1)));
    const std::string whole = "; a whole number from -2147483648 to 2147483647 is expected";
    const std::string in = " in section Simulation_Period (line ",
                      at = " in section Bathymetry_Selection (line ";
    const std::tuple<KvtHandle, const char*, int, int, std::string> cases[] = {
        {period, "Time_step_count", 1, kKvtErrKind,
         "KvtGetInteger: Time_step_count = \"forty\"" + in + "4) is not an integer" + whole},
        {period, "Wide_count", 1, kKvtErrRange,
         "KvtGetInteger: Wide_count = 4294967336" + in + "5) is beyond the 32-bit integer range" +
             whole},
        {top, "Level", 1, kKvtErrKind,
         "KvtGetInteger: Level = 1.5 in target TARNEL_BOUSSINESQ_WAVE (line 2) is not an integer" +
             whole},
        {period, "Start_time", 3, 1,
         "KvtGetInteger: Start_time = 2004, 1" + in +
             "7) gives 2 values where at least 3 are needed"},
        {period, "Time_step_interval", 1, 0,
         "KvtGetDouble: Time_step_interval = nan" + in + "6) is not a finite number"},
        {period, "Huge", 1, 0,
         "KvtGetReal: Huge = 1e+40" + in +
             "8) is beyond the 32-bit real range; a magnitude of at most 3.4028235e+38 is "
             "expected"},
        // With a status a short list gives the code of its last value.
        {period, "Start_time", 6, kKvtErrNotFound,
         "KvtGetIntegerList: Start_time = 2004, 1" + in + "7) gives 2 values where 6 are needed"},
        {period, "Levels", 2, 0,
         "KvtGetDoubleList: value 2 of Levels = 0.5, -inf" + in + "9) is not a finite number"},
        {bathy, "Hot_Start", 1, kKvtErrKind,
         "KvtGetLogical: Hot_Start = \"yes\"" + at +
             "13) is not a logical; true, false or an integer is expected"},
        {bathy, "Title", 1, kKvtErrKind,
         "KvtGetString: Title = 12" + at + "14) is not a text; a quoted text is expected"},
        {bathy, "File_name", 1, kKvtErrKind,
         "KvtGetFilename: File_name = true" + at +
             "15) is not a file name; file(\"name\") or a quoted text is expected"},
    };
    setenv("TRF", "HUD", 1);  // stop texts go to standard error, where death tests read them
    for (const auto& [section, key, n, code, message] : cases) {
        const std::string getter = message.substr(0, message.find(':'));
        EXPECT_EXIT(Get(getter, section, key, n, nullptr), testing::ExitedWithCode(1),
                    Literal(message) + "\n$");
        // The echo: the key and its values as the message gives them.
        const size_t from = message.find(std::string(key) + " = "), to = message.find(" in ");
        std::string echo = LastLogLine();
        echo = std::string(key) + " = " + echo.substr(echo.find(" : ") + 3);
        EXPECT_EQ(echo, message.substr(from, to - from));
        int status = -9;
        EXPECT_TRUE(Get(getter, section, key, n, &status)) << message;
        EXPECT_EQ(status, code) << message;
    }
    unsetenv("TRF");

    // What stays accepted: a real beyond 32 bits read as a double, an integer
    // for a real or a logical, a text for a file name.
    double huge = 0.0;
    float real = 0.0f;
    bool logical = false;
    std::string output;
    KvtGetDouble(period, "Huge", huge);
    KvtGetReal(period, "Whole", real);
    KvtGetLogical(period, "Whole", logical);
    KvtGetFilename(bathy, "Output", output);
    EXPECT_EQ(std::make_tuple(huge, real, logical, output),
              std::make_tuple(1e40, 40.0f, true, (dir.path / "out.nc").string()));
    kvtClose(&bad);
}

// An absent model file and one that is there but can't be read stop with
// their own texts, or leave the reason to a caller that passes a status.
TEST(AccessFiles, AbsentAndUnreadableModelFiles) {
    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "locked.bw", "TARNEL_BOUSSINESQ_WAVE {\n}\n");
    std::filesystem::permissions(dir / "locked.bw", std::filesystem::perms::none);
    std::vector<std::pair<std::string, std::string>> cases = {
        {dir / "absent.bw", ""}, {dir.path.string(), "Is a directory"}};
    if (geteuid() != 0)
        cases.emplace_back(dir / "locked.bw", "Permission denied");  // root reads all
    setenv("TRF", "HUD", 1);
    for (const auto& [path, reason] : cases) {
        int status = 0;
        EXPECT_EQ(KvtOpenFile(path, false, &status), 0u);
        EXPECT_EQ(std::make_pair(status, KvtLoadFailure()), std::make_pair(-1, reason));
        const std::string message = reason.empty()
                                        ? "KVT file: " + path + "not found"
                                        : "KVT file: " + path + " can not be read: " + reason;
        EXPECT_EXIT(KvtOpenFile(path, false), testing::ExitedWithCode(1), Literal(message));
    }
    unsetenv("TRF");
}

// The unread report through the access layer: each text in the log as a
// warning and on the screen. A section never opened is one warning; a key
// only counted is not read.
TEST_F(AccessLayer, WhatARunLeftUnreadIsWarnedInTheLogAndOnTheScreen) {
    const KvtHandle period = KvtOpenSection(target, "Simulation_Period");
    EXPECT_EQ(KvtParamCount(period, "Time_step_count"), 1);
    bwtest::LogCapture log;
    const char* buildMode = std::getenv("BUILDMODE");
    const std::string saved = buildMode != nullptr ? buildMode : "";
    setenv("BUILDMODE", "", 1);
    testing::internal::CaptureStdout();
    KvtWarnUnread(file);
    const std::string screen = testing::internal::GetCapturedStdout();
    setenv("BUILDMODE", saved.c_str(), 1);
    const std::string first =
        "Key Time_step_count in section Simulation_Period (line 3) is not read by this run";
    EXPECT_EQ(screen, "Warning: " + first +
                          "\nWarning: Section Bathymetry_Selection in target "
                          "TARNEL_BOUSSINESQ_WAVE (line 5) is not read by this run\n");
    const std::vector<std::string> lines = log.Lines();
    ASSERT_GE(lines.size(), 2u);
    EXPECT_EQ(lines[1], "Warning: " + first.substr(0, 60));  // the blank ending the piece is cut
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
