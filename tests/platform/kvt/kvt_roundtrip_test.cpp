// The writer: the text it makes, and trees (built or loaded) that load back
// the same bit for bit.
#include <gtest/gtest.h>

#include <cfloat>
#include <cmath>
#include <cstdint>
#include <string>

#include "platform/kvt/kvt.hpp"
#include "platform/kvt/kvt_compare.hpp"
#include "platform/kvt/kvt_test_util.hpp"
#include "support/test_support.hpp"

using kvttest::Load;
using kvttest::Param;
using kvttest::Target;

namespace {

// Writes a tree, loads it back and checks that both trees are equal. From the
// loaded tree on the text no longer changes (32-bit reals of a built tree
// load back as 64-bit reals of the same value, then written with 17 digits).
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
    ASSERT_EQ(kvtWrite(again, (dir / "c.kvt").c_str()), kKvtOk);
    EXPECT_EQ(bwtest::ReadFile(dir / "b.kvt"), bwtest::ReadFile(dir / "c.kvt"));
    kvtClose(&back);
    kvtClose(&again);
}

TEST(KvtRoundTrip, BuiltTreeWithEveryKindAndExtremeValues) {
    KvtHandle file = 0;
    kvtCreate(&file);
    ASSERT_EQ(kvtAddTarget(file, "MeshSolverBW"), kKvtOk);
    ASSERT_EQ(kvtAddSection(file, "MESH_0"), kKvtOk);
    ASSERT_EQ(kvtAddKeyword(file, "Doubles"), kKvtOk);
    const double doubles[] = {0.1,      -0.0,      DBL_MAX,      -DBL_MAX,     DBL_MIN,
                              4.9e-324, 1.0 / 3.0, 12.0,         -1e-17,       1e21,
                              HUGE_VAL, -HUGE_VAL, std::nan(""), -std::nan("")};
    for (double d : doubles) ASSERT_EQ(kvtAddDouble(file, d), kKvtOk);
    kvtAddKeyword(file, "Floats");
    const float floats[] = {1.1f, FLT_MAX, FLT_MIN, 1e-45f, 3.0f, -0.03f, 16777217.0f};
    for (float f : floats) ASSERT_EQ(kvtAddFloat(file, f), kKvtOk);
    kvtAddKeyword(file, "Integers");
    for (int32_t i : {0, -12, INT32_MIN, INT32_MAX}) ASSERT_EQ(kvtAddInt(file, i), kKvtOk);
    kvtAddKeyword(file, "Logicals");
    kvtAddBool(file, true);
    kvtAddBool(file, false);
    kvtAddKeyword(file, "Texts");
    kvtAddString(file, "");
    kvtAddString(file, "quote \" and backslash \\ and C:\\data\\bay\\");
    kvtAddString(file, "Wellenhöhe ≈ 2 m, # not a comment, \\\"");
    kvtAddFilename(file, "../data/bathy file.xol2");
    ASSERT_EQ(kvtAddSection(file, "Nested"), kKvtOk);
    kvtAddKeyword(file, "Deep");
    kvtAddInt(file, 1);
    kvtEndSection(file);
    kvtAddKeyword(file, "After_nested");  // order of sections and keywords is kept
    kvtAddBool(file, true);
    kvtEndSection(file);
    kvtEndSection(file);
    ASSERT_EQ(kvtAddTarget(file, "SECOND"), kKvtOk);
    kvtAddKeyword(file, "Alone");
    kvtAddDouble(file, 2.5);
    kvtEndSection(file);
    ExpectRoundTrip(file);

    // The values read back through the public calls, beside the comparison of the trees.
    bwtest::TempDir dir;
    ASSERT_EQ(kvtWrite(file, (dir / "w.kvt").c_str()), kKvtOk);
    KvtHandle back = 0;
    kvtLoadFile((dir / "w.kvt").c_str(), -1, &back);
    const KvtHandle mesh = kvtSectionByNameNum(Target(back, "MeshSolverBW"), "MESH_0", 1);
    for (int n = 1; n <= 14; ++n)
        EXPECT_TRUE(KvtSameReal(kvtGetDouble(Param(mesh, "Doubles", n)), doubles[n - 1])) << n;
    for (int n = 1; n <= 7; ++n) EXPECT_EQ(kvtGetFloat(Param(mesh, "Floats", n)), floats[n - 1]);
    EXPECT_STREQ(kvtGetName(kvtChildByNum(mesh, 7)), "After_nested");
    kvtClose(&back);
    kvtClose(&file);
}

TEST(KvtRoundTrip, TheWrittenText) {
    KvtHandle file = 0;
    kvtCreate(&file);
    kvtAddTarget(file, "A");
    kvtAddKeyword(file, "Real");
    kvtAddDouble(file, 12.0);
    kvtAddFloat(file, 0.1f);
    kvtAddDouble(file, 0.1);
    kvtAddSection(file, "S");
    kvtAddKeyword(file, "Text");
    kvtAddString(file, "a\"b\\c");
    kvtAddFilename(file, "x.nc");
    kvtAddInt(file, -3);
    kvtAddBool(file, false);
    kvtEndSection(file);
    kvtEndSection(file);
    kvtAddTarget(file, "B");
    kvtEndSection(file);
    bwtest::TempDir dir;
    ASSERT_EQ(kvtWrite(file, (dir / "t.kvt").c_str()), kKvtOk);
    EXPECT_EQ(bwtest::ReadFile(dir / "t.kvt"),
              "A {\n"
              "    Real = 12.0, 0.100000001, 0.10000000000000001\n"
              "    S {\n"
              "        Text = \"a\\\"b\\\\c\", file(\"x.nc\"), -3, false\n"
              "    }\n"
              "}\n"
              "\n"
              "B {\n"
              "}\n");
    kvtClose(&file);
}

TEST(KvtRoundTrip, LoadedFileKeepsOrderAndValues) {
    const std::string text = R"(# header comment
TARNEL_BOUSSINESQ_WAVE {   # target
    Simulation_Period
    {
        Time_step_count = 1000   # integer
        Start_time = 2004, 1, 1, 0, 0, 0
        Time_step_interval = 0.05
        Big = 9223372036854775807, -9223372036854775808
    }
    Sponge { Width = 1.0e-4 }
    Title = "State at the end, \"final\" \x"
    Sponge { Width = 3. }
    Data = file("data/bathy.xol2"), TRUE, False, -inf, NaN, +7, .5, 2.2250738585072014e-308
}
OTHER {}
TARNEL_BOUSSINESQ_WAVE { Second = 2 }
)";
    KvtHandle file = Load(text);
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk);
    ExpectRoundTrip(file);
    kvtClose(&file);
}

}  // namespace
