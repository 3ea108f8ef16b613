#include "platform/kvt/kvt.hpp"

#include <gtest/gtest.h>

#include <cfloat>
#include <climits>
#include <cmath>
#include <filesystem>

#include "platform/kvt/kvt_compare.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

KvtHandle Load(const std::string& text, const std::string& path = "/models/model.bw") {
    KvtHandle file = 0;
    kvtLoadText(text.data(), text.size(), path.c_str(), &file);
    return file;
}

KvtHandle Param(KvtHandle section, const char* key, int number = 1, int instance = 1) {
    return kvtParamByNum(kvtKeywordByNameNum(section, key, instance), number);
}

// Writes a tree, loads it back, and checks that the second tree equals the
// first; written and loaded once more, it stays the same bit for bit.
void ExpectRoundTrip(KvtHandle tree) {
    bwtest::TempDir dir;
    ASSERT_EQ(kvtWrite(tree, (dir / "a.kvt").c_str()), kKvtOk);
    KvtHandle back = 0;
    kvtLoadFile((dir / "a.kvt").c_str(), -1, &back);
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk) << bwtest::ReadFile(dir / "a.kvt");
    EXPECT_EQ(KvtTreeDifference(tree, back), "") << bwtest::ReadFile(dir / "a.kvt");
    ASSERT_EQ(kvtWrite(back, (dir / "b.kvt").c_str()), kKvtOk);
    KvtHandle again = 0;
    kvtLoadFile((dir / "b.kvt").c_str(), -1, &again);
    EXPECT_EQ(KvtTreeDifference(back, again), "");
    kvtClose(&back);
    kvtClose(&again);
}

TEST(KvtRoundTrip, BuiltTreeWithEveryKindAndExtremeValues) {
    KvtHandle file = 0;
    kvtCreate(&file);
    ASSERT_EQ(kvtAddTarget(file, "MeshSolverBW"), kKvtOk);
    ASSERT_EQ(kvtAddSection(file, "MESH_0"), kKvtOk);
    kvtAddKeyword(file, "Doubles");
    for (double d : {0.1, -0.0, 1e308, DBL_MIN, 4.9e-324, 1.0 / 3.0, 12.0, -1e-17, HUGE_VAL,
                     -HUGE_VAL, std::nan("")})
        ASSERT_EQ(kvtAddDouble(file, d), kKvtOk);
    kvtAddKeyword(file, "Floats");
    for (float f : {1.1f, FLT_MAX, FLT_MIN, 3.0f, -0.03f}) kvtAddFloat(file, f);
    kvtAddKeyword(file, "Integers");
    for (int32_t i : {0, -12, INT32_MIN, INT32_MAX}) kvtAddInt(file, i);
    kvtAddKeyword(file, "Logicals");
    kvtAddBool(file, true);
    kvtAddBool(file, false);
    kvtAddKeyword(file, "Texts");
    kvtAddString(file, "");
    kvtAddString(file, "quote \" and backslash \\ and C:\\data\\bay");
    kvtAddString(file, "Wellenhöhe ≈ 2 m, # not a comment");
    kvtAddFilename(file, "../data/bathy file.xol2");
    ASSERT_EQ(kvtAddSection(file, "Nested"), kKvtOk);
    kvtAddKeyword(file, "Deep");
    kvtAddInt(file, 1);
    kvtEndSection(file);
    kvtEndSection(file);
    kvtEndSection(file);
    ASSERT_EQ(kvtAddTarget(file, "SECOND"), kKvtOk);
    kvtAddKeyword(file, "Alone");
    kvtAddDouble(file, 2.5);
    kvtEndSection(file);
    ExpectRoundTrip(file);

    // A 32-bit real is written with 9 digits and reads back to the same float.
    const KvtHandle mesh =
        kvtSectionByNameNum(kvtTargetByNameNum(file, "MeshSolverBW", 1), "MESH_0", 1);
    EXPECT_EQ(kvtGetFloat(Param(mesh, "Floats", 1)), 1.1f);
    kvtClose(&file);
}

TEST(KvtRoundTrip, LoadedFileKeepsOrderCommentsAside) {
    const std::string text = R"(# header comment
TARNEL_BOUSSINESQ_WAVE {   # target
    Simulation_Period
    {
        Time_step_count = 1000   # integer
        Start_time = 2004, 1, 1, 0, 0, 0
        Time_step_interval = 0.05
    }
    Sponge { Width = 1.0e-4 }
    Sponge { Width = 3. }
    Title = "State at the end, \"final\""
    Data = file("data/bathy.xol2"), TRUE, False, -inf, NaN, +7, .5
}
OTHER {}
)";
    KvtHandle file = Load(text);
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk);
    ExpectRoundTrip(file);
    kvtClose(&file);
}

struct SyntaxCase {
    const char* text;
    int line, column;
    const char* message;
};

TEST(KvtSyntax, EveryErrorWithItsLineAndColumn) {
    const SyntaxCase cases[] = {
        {"T {\n  A {\n    key 5\n  }\n}\n", 3, 9, "expected '=' after a keyword name"},
        {"T {\n  key = \"open\n}\n", 2, 9, "unterminated text"},
        {"T {\n}\n}\n", 3, 1, "'}' without an open block"},
        {"T {\n  A {\n    k = 1\n", 2, 3, "a section was not closed"},
        {"T {\n  k =\n}\n", 2, 6, "expected a value after '='"},
        {"T {\n  k = 1,\n}\n", 2, 9, "expected a value after ','"},
        {"T {\n  k = 1 2\n}\n", 2, 9, "expected ',' or the end of the line after a value"},
        {"k = 1\n", 1, 1, "a keyword must stand inside a target"},
        {"T {\n  9k = 1\n}\n", 2, 3, "expected a name"},
        {"T {\n  k = yes\n}\n", 2, 7, "expected a value"},
        {"T {\n  k = 1.5e\n}\n", 2, 7, "malformed number"},
        {"T {\n  k = 99999999999999999999\n}\n", 2, 7, "integer out of range"},
        {"T {\n  k = file(\"a\"\n}\n", 2, 15, "expected ')' after the file name"},
        {"T {\n  k = \"é\" x\n}\n", 2, 11,
         "expected ',' or the end of the line"},  // columns count characters
        {"T {\n  lonely\n  k = 1\n}\n", 2, 9, "expected '=' or '{' after a name"},
    };
    for (const auto& c : cases) {
        KvtHandle file = Load(c.text);
        EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrSyntax) << c.text;
        int line = 0, column = 0;
        const char* message = nullptr;
        kvtGetSyntaxErr(file, &line, &column, &message);
        EXPECT_EQ(line, c.line) << c.text;
        EXPECT_EQ(column, c.column) << c.text;
        EXPECT_NE(std::string(message).find(c.message), std::string::npos)
            << c.text << " -> " << message;
        kvtClose(&file);
    }
}

TEST(KvtLookups, InstancesLevelsAndNames) {
    KvtHandle file =
        Load("T {\n A {\n  k = 1\n  k = 2\n  B { x = 1 }\n }\n A { k = 3 }\n}\nT { }\n");
    const KvtHandle t = kvtTargetByNameNum(file, "T", 1);
    EXPECT_NE(kvtTargetByNameNum(file, "T", 2), 0u);
    EXPECT_EQ(kvtTargetByNameNum(file, "T", 3), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrNotFound);
    const KvtHandle a1 = kvtSectionByNameNum(t, "A", 1);
    const KvtHandle a2 = kvtSectionByNameNum(t, "A", 2);
    EXPECT_EQ(kvtGetInt(Param(a1, "k", 1, 2)), 2);
    EXPECT_EQ(kvtGetInt(Param(a2, "k")), 3);
    EXPECT_EQ(kvtSectionByNameNum(t, "a", 1), 0u);  // names are matched as written
    const KvtHandle b = kvtSectionByNameNum(a1, "B", 1);
    EXPECT_EQ(kvtGetLevel(t), 0);
    EXPECT_EQ(kvtGetLevel(a1), 1);
    EXPECT_EQ(kvtGetLevel(b), 2);
    EXPECT_STREQ(kvtGetNameGlb(b), "T.A.B");
    EXPECT_EQ(Param(a1, "k", 2), 0u);  // one parameter only
    kvtClose(&file);
}

TEST(KvtValues, KindsConversionsAndTheErrorCode) {
    KvtHandle file = Load(
        "T {\n i = 7, 3000000000\n r = 2.5\n b = true\n s = \"x\"\n f = file(\"d/b.nc\")\n a = "
        "file(\"/abs/c.nc\")\n}\n",
        "/models/run/model.bw");
    const KvtHandle t = kvtTargetByNameNum(file, "T", 1);
    EXPECT_EQ(kvtGetDouble(Param(t, "i")), 7.0);  // an integer may be read as a real
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(kvtGetInt(Param(t, "r")), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrKind);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrKind);  // peeking never clears
    EXPECT_EQ(kvtGetFloat(Param(t, "r")), 2.5f);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);  // a call that succeeds clears it
    EXPECT_EQ(kvtGetInt(Param(t, "i", 2)), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrRange);
    EXPECT_EQ(kvtGetDouble(Param(t, "i", 2)), 3e9);
    EXPECT_FALSE(kvtGetBool(Param(t, "i")));
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrKind);
    EXPECT_TRUE(kvtGetBool(Param(t, "b")));
    EXPECT_EQ(kvtGetString(Param(t, "f")), nullptr);
    EXPECT_STREQ(kvtGetFilename(Param(t, "f")), "d/b.nc");
    EXPECT_STREQ(kvtGetResultFilenamePath(Param(t, "f")), "/models/run/d/b.nc");
    EXPECT_STREQ(kvtGetResultFilenamePath(Param(t, "a")), "/abs/c.nc");
    EXPECT_STREQ(kvtGetResultFilenamePath(Param(t, "s")),
                 "/models/run/x");  // a text as a file name
    EXPECT_TRUE(kvtIsFilename(Param(t, "f")));
    EXPECT_TRUE(kvtIsString(Param(t, "s")));
    EXPECT_TRUE(kvtIsInt(Param(t, "i")));
    kvtClose(&file);
}

TEST(KvtHandles, StaleAndUnfitHandlesAreErrorsNotCrashes) {
    KvtHandle file = Load("T { k = 1 }\n");
    const KvtHandle t = kvtTargetByNameNum(file, "T", 1);
    const KvtHandle p = Param(t, "k");
    EXPECT_EQ(kvtKeywordByNameNum(p, "k", 1), 0u);  // a parameter has no keywords
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    kvtClose(&file);
    EXPECT_EQ(file, 0u);
    EXPECT_EQ(kvtGetInt(p), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtTargetByNameNum(0xdeadbeef12345678ull, "T", 1), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
}

TEST(KvtBuilding, OutOfOrderCallsAndBadNamesAreRefused) {
    KvtHandle file = 0;
    kvtCreate(&file);
    EXPECT_EQ(kvtAddKeyword(file, "k"), kKvtErrBuild);  // no target open
    EXPECT_EQ(kvtAddTarget(file, "1bad"), kKvtErrName);
    EXPECT_EQ(kvtAddTarget(file, "T"), kKvtOk);
    EXPECT_EQ(kvtAddInt(file, 1), kKvtErrBuild);  // no keyword yet
    EXPECT_EQ(kvtAddKeyword(file, "k"), kKvtOk);
    EXPECT_EQ(kvtAddString(file, "two\nlines"), kKvtErrBuild);
    EXPECT_EQ(kvtEndSection(file), kKvtOk);
    EXPECT_EQ(kvtEndSection(file), kKvtErrBuild);
    bwtest::TempDir dir;
    EXPECT_EQ(kvtWrite(file, (dir / "no/such/folder/x.kvt").c_str()), kKvtErrFile);
    kvtClose(&file);
}

TEST(KvtFiles, MissingFileAndByteOrderMark) {
    KvtHandle file = 123;
    EXPECT_EQ(kvtLoadFile("/no/such/file.bw", -1, &file), 0u);
    EXPECT_EQ(file, 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrFile);
    file = Load("\xEF\xBB\xBFT { k = 1 }\n");
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_NE(kvtTargetByNameNum(file, "T", 1), 0u);
    kvtClose(&file);
}

}  // namespace
