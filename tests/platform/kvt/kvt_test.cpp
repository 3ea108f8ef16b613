// The parameter library: the loader (what it accepts, every syntax error with
// its place), the writer (its text, trees that load back bit for bit),
// look-ups, values and the error code, file names, handles and building calls.
#include "platform/kvt/kvt.hpp"

#include <gtest/gtest.h>

#include <cfloat>
#include <climits>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <string>

#include "platform/kvt/kvt_compare.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

// Loads a text as if it were the file at path.
KvtHandle Load(const std::string& text, const char* path = "/models/model.bw") {
    KvtHandle file = 0;
    kvtLoadText(text.data(), text.size(), path, &file);
    return file;
}

// Parameter number of instance of key in section.
KvtHandle Param(KvtHandle section, const char* key, int number = 1, int instance = 1) {
    return kvtParamByNum(kvtKeywordByNameNum(section, key, instance), number);
}

KvtHandle Target(KvtHandle file, const char* name = "T") {
    return kvtTargetByNameNum(file, name, 1);
}

bool Same(const char* a, const char* b) {
    return a != nullptr && std::strcmp(a, b) == 0;
}

// The text a tree writes, or the error code (and whether a file was left).
std::string Written(KvtHandle tree) {
    bwtest::TempDir dir;
    const int code = kvtWrite(tree, (dir / "w.kvt").c_str());
    if (code == kKvtOk) return bwtest::ReadFile(dir / "w.kvt");
    return "error " + std::to_string(code) + (fs::exists(dir / "w.kvt") ? " and a file" : "");
}

// The last syntax error of a tree as "line:column text".
std::string SyntaxError(KvtHandle file) {
    int line = -1, column = -1;
    const char* text = nullptr;
    kvtGetSyntaxErr(file, &line, &column, &text);
    return std::to_string(line) + ":" + std::to_string(column) + " " + text;
}

// Loads what a tree writes and checks that both trees are equal, reals bit
// for bit; returns the loaded tree.
KvtHandle ExpectRoundTrip(KvtHandle tree) {
    const std::string text = Written(tree);
    const KvtHandle back = Load(text);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk) << text;
    EXPECT_EQ(KvtTreeDifference(tree, back), "") << text;
    return back;
}

TEST(KvtSyntax, EveryErrorWithItsLineAndColumn) {
    const std::string value = "expected a value: a number, true, false, \"text\" or file(\"name\")";
    const std::string afterValue = " expected ',' or the end of the line after a value";
    const std::pair<std::string, std::string> cases[] = {
        {"T {\n  A {\n    key 5\n  }\n}\n", "3:9 expected '=' after a keyword name"},
        {"T {\n  key = \"open\n}\n", "2:9 unterminated text"},
        {"T {\n}\n}\n", "3:1 '}' without an open block"},
        {"T {\n  A {\n    B {\n    }\n", "2:3 a section was not closed"},
        {"T {\n  k = 1\n", "1:1 a target was not closed"},
        {"T {\n  k =\n}\n", "2:6 expected a value after '='"},
        {"T {\n  k = # none\n}\n", "2:7 expected a value after '='"},
        {"T {\n  k = 1,\n}\n", "2:9 expected a value after ','"},
        {"T {\n  k = 1, }\n", "2:10 expected a value after ','"},
        {"T {\n  k = 1 2\n}\n", "2:9" + afterValue},
        {"T {\n} k = 1\n", "2:3 a keyword must stand inside a target"},
        {"T {\n  9k = 1\n}\n", "2:3 expected a name"},
        {"T {\n  { k = 1 }\n}\n", "2:3 expected a name before '{'"},
        {"T\nU {\n}\n", "1:2 expected '{' after a target name"},
        {"T {\n  lonely\n  k = 1\n}\n", "2:9 expected '=' or '{' after a name"},
        {"T {\n  k = yes\n}\n", "2:7 " + value},
        {"T {\n  k = 1.5e\n}\n", "2:7 malformed number"},
        {"T {\n  k = 1.2.3\n}\n", "2:7 malformed number"},
        {"T {\n  k = 12abc\n}\n", "2:7 malformed number"},
        {"T {\n  k = -\n}\n", "2:7 malformed number"},
        {"T {\n  k = -infinity\n}\n", "2:7 malformed number"},
        {"T {\n  k = 9223372036854775808\n}\n", "2:7 integer out of range"},
        {"T {\n  k = -1e999\n}\n", "2:7 real out of range"},
        {"T {\n  k = file(\"a\"\n}\n", "2:15 expected ')' after the file name"},
        {"T {\n  k = file(a)\n}\n", "2:12 expected a quoted name after 'file('"},
        {std::string("T {\n  k = \"a\0b\"\n}\n", 18), "2:9 a text can't hold a NUL character"},
        // Columns count characters, not bytes, and a tab is one.
        {"T {\n  k = \"é≈\" x\n}\n", "2:12" + afterValue},
        {"T {\n\tk\t= 1 x\n}\n", "2:8" + afterValue},
        {"T {\n  k = 1 2\n  j =\n", "2:9" + afterValue},  // only the first error counts
    };
    for (const auto& [text, error] : cases) {
        KvtHandle file = Load(text);
        EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrSyntax) << text;
        EXPECT_EQ(SyntaxError(file), error) << text;
        kvtClose(&file);
    }
}

// Every form the loader accepts, seen in what the loaded tree writes: the
// writer gives reals 17 digits, so the text shows each value bit for bit.
TEST(KvtSyntax, AcceptedFormsAsTheTreeWritesThem) {
    KvtHandle file = Load(
        "\xEF\xBB\xBF# a byte-order mark, then a comment\r\n"
        "T   # the block opens two lines below\r\n\r\n{\r\n"
        "  i = -12, +3, 007, -9223372036854775808, 9223372036854775807\r\n"
        "  r = 0.05, 1.0e-4, 3., .5, -.5e+1, 1E2, inf, -INF, NaN, -nan\r\n"
        "  b = true, FALSE, True\r\n"
        "  s = \"a \\\"q\\\" b\\\\c \\d # no comment\", \"\"  # a comment\r\n"
        "  f = file( \"d/x.nc\" )\r\n"
        "  S { k = 1 }\r\n  S\r\n  {\r\n    k = 2 }\r\n"
        "}\r\nU{}");
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(SyntaxError(file), "0:0 ");
    EXPECT_EQ(Written(file),
              "T {\n"
              "    i = -12, 3, 7, -9223372036854775808, 9223372036854775807\n"
              "    r = 0.050000000000000003, 0.0001, 3.0, 0.5, -5.0, 100.0, inf, -inf, nan, -nan\n"
              "    b = true, false, true\n"
              "    s = \"a \\\"q\\\" b\\\\c \\\\d # no comment\", \"\"\n"
              "    f = file(\"d/x.nc\")\n"
              "    S {\n        k = 1\n    }\n"
              "    S {\n        k = 2\n    }\n"
              "}\n\nU {\n}\n");
    KvtHandle back = ExpectRoundTrip(file);
    kvtClose(&back);
    kvtClose(&file);
}

// What was read before a syntax error stays, but not a keyword without any
// value, so that the tree writes and loads back.
TEST(KvtSyntax, TheTreeBeforeAnErrorStaysAndWritesCleanly) {
    const struct {
        const char* text;
        const char* written;
    } cases[] = {
        {"T {\n  a = 1\n  S {\n    b = 2, 3, oops\n    c = 4\n  }\n}\nU { }\n",
         "T {\n    a = 1\n    S {\n        b = 2, 3\n    }\n}\n"},
        {"T {\n  a = 1\n  b =\n}\n", "T {\n    a = 1\n}\n"},
    };
    for (const auto& c : cases) {
        KvtHandle file = Load(c.text);
        EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrSyntax);
        EXPECT_EQ(Written(file), c.written);
        KvtHandle back = ExpectRoundTrip(file);
        kvtClose(&back);
        kvtClose(&file);
    }
}

TEST(KvtSyntax, NestingIsBoundedByMemoryNotTheCallStack) {
    constexpr int kDepth = 100000;
    std::string text = "T {";
    for (int i = 0; i < kDepth; ++i) text += "S{";
    KvtHandle file = Load(text + "\nk = 1\n" + std::string(kDepth + 1, '}'));
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk);
    KvtHandle node = Target(file);
    for (int i = 0; i < kDepth; ++i) node = kvtSectionByNameNum(node, "S", 1);
    ASSERT_NE(node, 0u);
    EXPECT_EQ(kvtGetLevel(node), kDepth);
    EXPECT_EQ(kvtGetLevel(kvtKeywordByNameNum(node, "k", 1)), kDepth);
    EXPECT_EQ(std::string(kvtGetNameGlb(node)).size(), 1u + 2u * kDepth);
    kvtClose(&file);
}

// Building calls out of order, bad names and texts that would break a line
// are refused and add nothing. The writer's text: four blanks a level, 17
// digits for 64-bit and 9 for 32-bit reals, ".0" where a real would look like
// an integer, texts escaped, a blank line between targets, blocks left open
// closed; every value loads back bit for bit. A keyword without parameters
// can't be written.
TEST(KvtBuilding, BuiltTreeWrittenAndLoadedBack) {
    KvtHandle file = 0;
    kvtCreate(&file);
    EXPECT_EQ(kvtAddKeyword(file, "k"), kKvtErrBuild);  // no target open
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrBuild);
    EXPECT_EQ(kvtAddSection(file, "S"), kKvtErrBuild);
    EXPECT_EQ(kvtEndSection(file), kKvtErrBuild);
    for (const char* bad : {"1bad", "", "a-b", "a b", "é", static_cast<const char*>(nullptr)})
        EXPECT_EQ(kvtAddTarget(file, bad), kKvtErrName) << (bad ? bad : "null");
    ASSERT_EQ(kvtAddTarget(file, "MeshSolverBW"), kKvtOk);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(kvtAddTarget(file, "U"), kKvtErrBuild);  // a target is open
    EXPECT_EQ(kvtAddInt(file, 1), kKvtErrBuild);       // no keyword yet
    ASSERT_EQ(kvtAddSection(file, "MESH_0"), kKvtOk);
    ASSERT_EQ(kvtAddKeyword(file, "Doubles"), kKvtOk);
    for (double d : {0.1, -0.0, DBL_MAX, DBL_MIN, 4.9e-324, 1.0 / 3, 12.0, 1e21, HUGE_VAL,
                     -HUGE_VAL, std::nan(""), -std::nan("")})
        ASSERT_EQ(kvtAddDouble(file, d), kKvtOk);
    kvtAddKeyword(file, "Floats");
    for (float f : {1.1f, FLT_MAX, 1e-45f, 3.0f, -0.03f, 16777217.0f})
        ASSERT_EQ(kvtAddFloat(file, f), kKvtOk);
    kvtAddKeyword(file, "Integers");
    for (int32_t i : {0, -12, INT32_MIN, INT32_MAX}) ASSERT_EQ(kvtAddInt(file, i), kKvtOk);
    kvtAddKeyword(file, "Logicals");
    kvtAddBool(file, true);
    kvtAddBool(file, false);
    ASSERT_EQ(kvtAddSection(file, "Nested"), kKvtOk);
    EXPECT_EQ(kvtAddInt(file, 1), kKvtErrBuild);  // the keyword ended with the section
    kvtAddKeyword(file, "Texts");
    EXPECT_EQ(kvtAddString(file, "two\nlines"), kKvtErrBuild);
    EXPECT_EQ(kvtAddFilename(file, nullptr), kKvtErrBuild);
    for (const char* text : {"", "quote \" and backslash \\ and C:\\bay\\", "Höhe ≈ 2 m # \\\""})
        ASSERT_EQ(kvtAddString(file, text), kKvtOk);
    kvtAddFilename(file, "../data/bathy file.xol2");
    kvtEndSection(file);
    kvtAddKeyword(file, "After_nested");
    kvtAddBool(file, true);
    kvtEndSection(file);
    kvtEndSection(file);
    EXPECT_EQ(kvtEndSection(file), kKvtErrBuild);
    ASSERT_EQ(kvtAddTarget(file, "SECOND"), kKvtOk);
    EXPECT_EQ(Written(file),
              "MeshSolverBW {\n    MESH_0 {\n"
              "        Doubles = 0.10000000000000001, -0.0, 1.7976931348623157e+308, "
              "2.2250738585072014e-308, 4.9406564584124654e-324, 0.33333333333333331, 12.0, "
              "1e+21, inf, -inf, nan, -nan\n"
              "        Floats = 1.10000002, 3.40282347e+38, 1.40129846e-45, 3.0, -0.0299999993, "
              "16777216.0\n"
              "        Integers = 0, -12, -2147483648, 2147483647\n"
              "        Logicals = true, false\n"
              "        Nested {\n"
              "            Texts = \"\", \"quote \\\" and backslash \\\\ and C:\\\\bay\\\\\", "
              "\"Höhe ≈ 2 m # \\\\\\\"\", file(\"../data/bathy file.xol2\")\n"
              "        }\n"
              "        After_nested = true\n"
              "    }\n}\n\nSECOND {\n}\n");
    KvtHandle back = ExpectRoundTrip(file);
    kvtClose(&back);
    EXPECT_EQ(kvtWrite(file, "/no/such/folder/x.kvt"), kKvtErrFile);
    EXPECT_EQ(Written(Target(file, "SECOND")), "error " + std::to_string(kKvtErrHandle));
    kvtAddKeyword(file, "Empty");
    EXPECT_EQ(Written(file), "error " + std::to_string(kKvtErrBuild));
    kvtClose(&file);
}

// Names and instances, the walk in file order with paths and levels; look-ups
// that find nothing give 0 and kKvtErrNotFound.
TEST(KvtLookups, ByNameAndInstanceAndInFileOrder) {
    KvtHandle file = Load(
        "T {\n A {\n  k = 1\n  k = 2, 5\n  B { x = 1 }\n  k { }\n }\n A { k = 3 }\n}\nT { }\n");
    const KvtHandle t = Target(file), a1 = kvtSectionByNameNum(t, "A", 1);
    EXPECT_EQ(kvtGetInt(Param(a1, "k", 1, 2)), 2);
    EXPECT_EQ(kvtGetInt(Param(a1, "k", 2, 2)), 5);
    EXPECT_EQ(kvtGetInt(Param(kvtSectionByNameNum(t, "A", 2), "k")), 3);
    EXPECT_NE(kvtSectionByNameNum(a1, "k", 1), 0u);  // a section may share a keyword's name
    const auto missing = [](KvtHandle found) {
        return found == 0 && kvtPeekErrorGlb() == kKvtErrNotFound;
    };
    EXPECT_TRUE(missing(kvtTargetByNameNum(file, "T", 3)));
    EXPECT_TRUE(missing(kvtTargetByNameNum(file, "T", 0)));
    EXPECT_TRUE(missing(kvtKeywordByNameNum(a1, "k", 3)));  // the section k is no keyword
    EXPECT_TRUE(missing(kvtSectionByNameNum(t, "a", 1)));   // names are matched as written
    EXPECT_TRUE(missing(kvtKeywordByNameNum(t, "A", 1)));
    EXPECT_TRUE(missing(Param(a1, "k", 2)));
    EXPECT_TRUE(missing(kvtChildByNum(file, 3)));
    EXPECT_TRUE(missing(kvtChildByNum(a1, 5)));

    std::string walk;  // path, '=' for a keyword or '{' for a section, level
    for (int n = 1; n <= 4; ++n) {
        const KvtHandle child = kvtChildByNum(a1, n);
        walk += std::string(kvtGetNameGlb(child)) + (kvtIsKeyword(child) ? "=" : "{") +
                std::to_string(kvtGetLevel(child)) + " ";
    }
    EXPECT_EQ(walk, "T.A.k=1 T.A.k=1 T.A.B{2 T.A.k{2 ");
    EXPECT_EQ(kvtGetLevel(t), 0);
    EXPECT_STREQ(kvtGetName(kvtChildByNum(a1, 3)), "B");
    EXPECT_EQ(kvtChildByNum(file, 2), kvtTargetByNameNum(file, "T", 2));
    EXPECT_EQ(kvtGetInt(kvtChildByNum(kvtChildByNum(a1, 2), 2)), 5);
    EXPECT_EQ(kvtChildByNum(kvtChildByNum(kvtChildByNum(a1, 1), 1), 1), 0u);  // of a parameter
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    kvtClose(&file);
}

// Big sections are searched through a name index, of keywords and sections
// apart: every instance must be the right one, also of children added after
// the index was made. Texts handed out stay valid while the tree grows, short
// ones (kept inside their node) too.
TEST(KvtLookups, BigSectionsFindEveryInstanceAndTextsStayValid) {
    KvtHandle file = 0;
    kvtCreate(&file);
    kvtAddTarget(file, "T");
    kvtAddKeyword(file, "s");
    kvtAddString(file, "v");
    const KvtHandle t = Target(file), s = kvtKeywordByNameNum(t, "s", 1);
    const char* texts[] = {kvtGetName(s), kvtGetNameGlb(s), kvtGetString(kvtParamByNum(s, 1))};
    for (int i = 0; i < 4; ++i)
        for (int k = 0; k < 2500; ++k) {
            kvtAddKeyword(file, ("k" + std::to_string(k)).c_str());
            kvtAddInt(file, i * 10000 + k);
        }
    for (int k = 0; k < 2500; ++k) {
        const std::string name = "k" + std::to_string(k);
        for (int i = 1; i <= 4; ++i)
            ASSERT_EQ(kvtGetInt(Param(t, name.c_str(), 1, i)), (i - 1) * 10000 + k) << name << i;
        ASSERT_EQ(kvtKeywordByNameNum(t, name.c_str(), 5), 0u);
    }
    kvtAddKeyword(file, "k7");
    kvtAddInt(file, 5);
    kvtAddSection(file, "k8");
    EXPECT_EQ(kvtGetInt(Param(t, "k7", 1, 5)), 5);
    EXPECT_NE(kvtSectionByNameNum(t, "k8", 1), 0u);
    EXPECT_EQ(kvtKeywordByNameNum(t, "k8", 5), 0u);
    EXPECT_EQ(kvtSectionByNameNum(t, "k7", 1), 0u);
    EXPECT_STREQ(texts[0], "s");
    EXPECT_STREQ(texts[1], "T.s");
    EXPECT_STREQ(texts[2], "v");
    EXPECT_EQ(kvtGetNameGlb(s), texts[1]);  // made once
    kvtClose(&file);
}

// Each call's outcome and the error code right after it (a braced list is
// evaluated in order). An integer may be read as a real and a text as a file
// name; every other mismatch, an integer beyond 32 bits and an unfit handle
// give 0, false or null. Every call sets the code, kind queries too; peeking
// leaves it. Only the file handle ends a tree; then its handles are refused.
TEST(KvtValues, KindsConversionsHandlesAndTheErrorCode) {
    KvtHandle file = Load(
        "T {\n i = 7, 3000000000, -2147483648\n r = 2.5, 0.1, 1e300\n b = true\n s = \"x\"\n"
        " f = file(\"d/b.nc\")\n}\n");
    // Handles taken beforehand, so that no look-up sets the code between the calls.
    const KvtHandle t = Target(file), p = Param(t, "i"), i2 = Param(t, "i", 2);
    const KvtHandle i3 = Param(t, "i", 3), r = Param(t, "r"), r2 = Param(t, "r", 2);
    const KvtHandle r3 = Param(t, "r", 3), b = Param(t, "b"), s = Param(t, "s"), f = Param(t, "f");
    const struct {
        bool right;
        int error, expected;
        const char* what;
    } calls[] = {
        {kvtGetDouble(p) == 7.0, kvtPeekErrorGlb(), kKvtOk, "real of an integer"},
        {kvtGetInt(r) == 0, kvtPeekErrorGlb(), kKvtErrKind, "integer of a real"},
        {kvtPeekErrorGlb() == kKvtErrKind, kvtPeekErrorGlb(), kKvtErrKind, "peeked again"},
        {kvtGetFloat(r) == 2.5f, kvtPeekErrorGlb(), kKvtOk, "32-bit real"},
        {kvtGetFloat(r2) == 0.1f, kvtPeekErrorGlb(), kKvtOk, "rounded to nearest"},
        {kvtGetFloat(r3) == HUGE_VALF, kvtPeekErrorGlb(), kKvtOk, "beyond: inf"},
        {kvtGetInt(i2) == 0, kvtPeekErrorGlb(), kKvtErrRange, "beyond 32 bits"},
        {kvtGetDouble(i2) == 3e9, kvtPeekErrorGlb(), kKvtOk, "as a real"},
        {kvtGetInt(i3) == INT_MIN, kvtPeekErrorGlb(), kKvtOk, "least 32-bit"},
        {!kvtGetBool(p), kvtPeekErrorGlb(), kKvtErrKind, "logical of an integer"},
        {kvtGetBool(b), kvtPeekErrorGlb(), kKvtOk, "logical"},
        {kvtGetDouble(b) == 0.0, kvtPeekErrorGlb(), kKvtErrKind, "real of a logical"},
        {Same(kvtGetFilename(f), "d/b.nc"), kvtPeekErrorGlb(), kKvtOk, "file name"},
        {kvtGetInt(s) == 0, kvtPeekErrorGlb(), kKvtErrKind, "integer of a text"},
        {Same(kvtGetFilename(s), "x"), kvtPeekErrorGlb(), kKvtOk, "file of a text"},
        {!kvtGetString(f), kvtPeekErrorGlb(), kKvtErrKind, "text of a file name"},
        {!kvtGetFilename(r), kvtPeekErrorGlb(), kKvtErrKind, "file name of a real"},
        {kvtIsFilename(f) && !kvtIsString(f) && !kvtIsReal(p), kvtPeekErrorGlb(), kKvtOk, "kinds"},
        {kvtGetInt(s) == 0, kvtPeekErrorGlb(), kKvtErrKind, "integer of a text"},
        {kvtKeywordByNameNum(t, "none", 1) == 0, kvtPeekErrorGlb(), kKvtErrNotFound, "no key"},
        {kvtKeywordByNameNum(p, "k", 1) == 0, kvtPeekErrorGlb(), kKvtErrHandle, "of a parameter"},
        {kvtGetName(p) == nullptr, kvtPeekErrorGlb(), kKvtErrHandle, "name of a parameter"},
        {kvtGetInt(t) == 0, kvtPeekErrorGlb(), kKvtErrHandle, "value of a target"},
        {kvtAddKeyword(t, "x") == kKvtErrHandle, kvtPeekErrorGlb(), kKvtErrHandle, "building"},
        {kvtTargetByNameNum(0, "T", 1) == 0, kvtPeekErrorGlb(), kKvtErrHandle, "null handle"},
        {kvtGetInt(file + 1000) == 0, kvtPeekErrorGlb(), kKvtErrHandle, "beyond the nodes"},
    };
    for (const auto& c : calls) {
        EXPECT_TRUE(c.right) << c.what;
        EXPECT_EQ(c.error, c.expected) << c.what;
    }
    KvtHandle notFile = t;
    kvtClose(&notFile);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtGetInt(p), 7);
    kvtClose(&file);
    EXPECT_EQ(file, 0u);
    EXPECT_EQ(kvtGetInt(p), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    kvtClose(&file);  // twice: a null handle
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
}

// Relative file names are taken from the folder of the file (of a text
// without a path: the working folder); a path too long is refused, not cut.
// A missing file or a folder can't be loaded; an empty file can.
TEST(KvtFiles, RelativeAndAbsoluteNamesAndUnreadableFiles) {
    KvtHandle file = Load(
        "T {\n f = file(\"d/./b.nc\"), file(\"../up/c.nc\"), file(\"/abs/x/../c.nc\"), "
        "\"s.nc\"\n}\n",
        "/models/run/model.bw");
    const char* paths[] = {"/models/run/d/b.nc", "/models/up/c.nc", "/abs/c.nc",
                           "/models/run/s.nc"};
    for (int n = 1; n <= 4; ++n)
        EXPECT_STREQ(kvtGetResultFilenamePath(Param(Target(file), "f", n)), paths[n - 1]);
    EXPECT_STREQ(kvtGetFilename(Param(Target(file), "f", 2)), "../up/c.nc");  // as written
    kvtClose(&file);

    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "m.kvt", "T { f = file(\"x/y.nc\") }\n");
    kvtLoadFile((dir / "m.kvt").c_str(), -1, &file);
    EXPECT_EQ(fs::path(kvtGetResultFilenamePath(Param(Target(file), "f"))),
              (fs::canonical(dir.path) / "x/y.nc").lexically_normal());
    kvtClose(&file);
    file = Load("T { f = file(\"y.nc\") }\n", nullptr);
    EXPECT_EQ(fs::path(kvtGetResultFilenamePath(Param(Target(file), "f"))),
              fs::current_path() / "y.nc");
    kvtClose(&file);
    file = Load("T { f = \"" + std::string(2100, 'n') + "\" }\n");
    EXPECT_EQ(kvtGetResultFilenamePath(Param(Target(file), "f")), nullptr);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrRange);
    kvtClose(&file);

    bwtest::WriteFile(dir / "empty.kvt", "");
    for (const std::string& path : {std::string("/no/such/file.bw"), dir.path.string()}) {
        file = 123;
        EXPECT_EQ(kvtLoadFile(path.c_str(), -1, &file), 0u);
        EXPECT_EQ(file, 0u);
        EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrFile);
    }
    EXPECT_NE(kvtLoadFile((dir / "empty.kvt").c_str(), -1, &file), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(kvtChildByNum(file, 1), 0u);
    kvtClose(&file);
}

}  // namespace
