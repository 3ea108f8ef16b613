// The loader: what it accepts, and every syntax error with its line, column
// and text; the tree read before an error stays usable.
#include <gtest/gtest.h>

#include <cmath>
#include <string>

#include "platform/kvt/kvt.hpp"
#include "platform/kvt/kvt_test_util.hpp"
#include "support/test_support.hpp"

using kvttest::Load;
using kvttest::Param;
using kvttest::Target;

namespace {

struct SyntaxCase {
    std::string text;
    int line, column;
    const char* message;
};

TEST(KvtSyntax, EveryErrorWithItsLineAndColumn) {
    const std::string value = "expected a value: a number, true, false, \"text\" or file(\"name\")";
    const SyntaxCase cases[] = {
        {"T {\n  A {\n    key 5\n  }\n}\n", 3, 9, "expected '=' after a keyword name"},
        {"T {\n  key = \"open\n}\n", 2, 9, "unterminated text"},
        {"T {\n}\n}\n", 3, 1, "'}' without an open block"},
        {"T {\n  A {\n    k = 1\n", 2, 3, "a section was not closed"},
        {"T {\n  A {\n    B {\n    }\n", 2, 3, "a section was not closed"},
        {"T {\n  k = 1\n", 1, 1, "a target was not closed"},
        {"T {\n  k =\n}\n", 2, 6, "expected a value after '='"},
        {"T {\n  k = # none\n}\n", 2, 7, "expected a value after '='"},
        {"T {\n  k = 1,\n}\n", 2, 9, "expected a value after ','"},
        {"T {\n  k = 1, }\n", 2, 10, "expected a value after ','"},
        {"T {\n  k = 1 2\n}\n", 2, 9, "expected ',' or the end of the line after a value"},
        {"T {\n  k = \"a\"\"b\"\n}\n", 2, 10, "expected ',' or the end of the line after a value"},
        {"k = 1\n", 1, 1, "a keyword must stand inside a target"},
        {"T {\n} k = 1\n", 2, 3, "a keyword must stand inside a target"},
        {"T {\n  9k = 1\n}\n", 2, 3, "expected a name"},
        {"T {\n  { k = 1 }\n}\n", 2, 3, "expected a name before '{'"},
        {"T\nU {\n}\n", 1, 2, "expected '{' after a target name"},
        {"T {\n  lonely\n  k = 1\n}\n", 2, 9, "expected '=' or '{' after a name"},
        {"T {\n  k = yes\n}\n", 2, 7, value.c_str()},
        {"T {\n  k = 1.5e\n}\n", 2, 7, "malformed number"},
        {"T {\n  k = 1.2.3\n}\n", 2, 7, "malformed number"},
        {"T {\n  k = 12abc\n}\n", 2, 7, "malformed number"},
        {"T {\n  k = -\n}\n", 2, 7, "malformed number"},
        {"T {\n  k = -infinity\n}\n", 2, 7, "malformed number"},
        {"T {\n  k = 9223372036854775808\n}\n", 2, 7, "integer out of range"},
        {"T {\n  k = -1e999\n}\n", 2, 7, "real out of range"},
        {"T {\n  k = file(\"a\"\n}\n", 2, 15, "expected ')' after the file name"},
        {"T {\n  k = file(a)\n}\n", 2, 12, "expected a quoted name after 'file('"},
        {std::string("T {\n  k = \"a\0b\"\n}\n", 18), 2, 9, "a text can't hold a NUL character"},
        // Columns count characters, not bytes, and a tab is one.
        {"T {\n  k = \"é≈\" x\n}\n", 2, 12, "expected ',' or the end of the line after a value"},
        {"T {\n\tk\t= 1 x\n}\n", 2, 8, "expected ',' or the end of the line after a value"},
        // Only the first error counts.
        {"T {\n  k = 1 2\n  j =\n", 2, 9, "expected ',' or the end of the line after a value"},
    };
    for (const auto& c : cases) {
        KvtHandle file = Load(c.text);
        EXPECT_NE(file, 0u) << c.text;
        EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrSyntax) << c.text;
        int line = 0, column = 0;
        const char* message = nullptr;
        kvtGetSyntaxErr(file, &line, &column, &message);
        EXPECT_EQ(line, c.line) << c.text;
        EXPECT_EQ(column, c.column) << c.text;
        EXPECT_STREQ(message, c.message) << c.text;
        kvtClose(&file);
    }
}

TEST(KvtSyntax, AcceptedFormsAndTheirValues) {
    const std::string text =
        "\xEF\xBB\xBF# a byte-order mark, then a comment\r\n"
        "T   # the block opens two lines below\r\n"
        "\r\n"
        "{\r\n"
        "  i = -12, +3, 007, -9223372036854775808, 9223372036854775807\r\n"
        "  r = 0.05, 1.0e-4, 3., .5, -.5e+1, 1E2, inf, -INF, NaN, -nan\r\n"
        "  b = true, FALSE, True\r\n"
        "  s = \"a \\\"q\\\" b\\\\c \\d # no comment\", \"\"  # a comment\r\n"
        "  f = file( \"d/x.nc\" )\r\n"
        "  S { k = 1 }\r\n"
        "  S\r\n"
        "  {\r\n"
        "    k = 2 }\r\n"
        "}\r\n"
        "U{}";
    KvtHandle file = Load(text);
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk);
    int line = -1, column = -1;
    const char* message = nullptr;
    kvtGetSyntaxErr(file, &line, &column, &message);
    EXPECT_EQ(line, 0);
    EXPECT_STREQ(message, "");

    const KvtHandle t = Target(file);
    const int64_t ints[] = {-12, 3, 7};
    for (int n = 1; n <= 3; ++n) {
        EXPECT_TRUE(kvtIsInt(Param(t, "i", n)));
        EXPECT_EQ(kvtGetInt(Param(t, "i", n)), ints[n - 1]);
    }
    // Integers are held in 64 bits: the extremes are there, read as reals.
    EXPECT_EQ(kvtGetDouble(Param(t, "i", 4)), -9223372036854775808.0);
    EXPECT_EQ(kvtGetDouble(Param(t, "i", 5)), 9223372036854775807.0);

    const double reals[] = {0.05, 1.0e-4, 3.0, 0.5, -5.0, 100.0, HUGE_VAL, -HUGE_VAL};
    for (int n = 1; n <= 8; ++n) {
        EXPECT_TRUE(kvtIsReal(Param(t, "r", n))) << n;
        EXPECT_EQ(kvtGetDouble(Param(t, "r", n)), reals[n - 1]) << n;
    }
    EXPECT_TRUE(std::isnan(kvtGetDouble(Param(t, "r", 9))));
    EXPECT_TRUE(std::signbit(kvtGetDouble(Param(t, "r", 10))));

    EXPECT_TRUE(kvtGetBool(Param(t, "b", 1)));
    EXPECT_FALSE(kvtGetBool(Param(t, "b", 2)));
    EXPECT_TRUE(kvtGetBool(Param(t, "b", 3)));
    EXPECT_STREQ(kvtGetString(Param(t, "s", 1)), "a \"q\" b\\c \\d # no comment");
    EXPECT_STREQ(kvtGetString(Param(t, "s", 2)), "");
    EXPECT_EQ(Param(t, "s", 3), 0u);
    EXPECT_STREQ(kvtGetFilename(Param(t, "f")), "d/x.nc");
    EXPECT_EQ(kvtGetInt(Param(kvtSectionByNameNum(t, "S", 2), "k")), 2);
    EXPECT_NE(Target(file, "U"), 0u);
    kvtClose(&file);
}

TEST(KvtSyntax, TheTreeBeforeAnErrorStaysAndWritesCleanly) {
    KvtHandle file = Load(
        "T {\n  a = 1\n  S {\n    b = 2, 3, oops\n    c = 4\n  }\n}\n"
        "U {\n  d =\n}\n");
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrSyntax);
    const KvtHandle s = kvtSectionByNameNum(Target(file), "S", 1);
    EXPECT_EQ(kvtGetInt(Param(Target(file), "a")), 1);
    EXPECT_EQ(kvtGetInt(Param(s, "b", 2)), 3);
    EXPECT_EQ(Param(s, "b", 3), 0u);
    EXPECT_EQ(kvtKeywordByNameNum(s, "c", 1), 0u);
    EXPECT_EQ(Target(file, "U"), 0u);
    kvtClose(&file);

    // A keyword whose first value is missing is dropped, so the rest can be
    // written and loaded back.
    file = Load("T {\n  a = 1\n  b =\n}\n");
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrSyntax);
    EXPECT_EQ(kvtKeywordByNameNum(Target(file), "b", 1), 0u);
    EXPECT_EQ(kvtChildByNum(Target(file), 2), 0u);
    bwtest::TempDir dir;
    ASSERT_EQ(kvtWrite(file, (dir / "part.kvt").c_str()), kKvtOk);
    KvtHandle back = 0;
    kvtLoadFile((dir / "part.kvt").c_str(), -1, &back);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(kvtGetInt(Param(Target(back), "a")), 1);
    kvtClose(&back);
    kvtClose(&file);
}

TEST(KvtSyntax, NestingIsBoundedByMemoryNotTheCallStack) {
    constexpr int kDepth = 100000;
    std::string text = "T {";
    for (int i = 0; i < kDepth; ++i) text += "S{";
    text += "\nk = 1\n";
    text += std::string(kDepth + 1, '}');
    KvtHandle file = Load(text);
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk);
    KvtHandle node = Target(file);
    for (int i = 0; i < kDepth; ++i) node = kvtSectionByNameNum(node, "S", 1);
    ASSERT_NE(node, 0u);
    EXPECT_EQ(kvtGetLevel(node), kDepth);
    EXPECT_EQ(kvtGetLevel(kvtKeywordByNameNum(node, "k", 1)), kDepth);
    EXPECT_EQ(std::string(kvtGetNameGlb(node)).size(), 1u + 2u * kDepth);
    kvtClose(&file);
}

}  // namespace
