// The parameter library: the loader (what it accepts, every syntax error with
// its place), the writer (its text, trees that load back bit for bit),
// look-ups, values and the error code, file names, handles and building calls.
#include "platform/kvt/kvt.hpp"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cfloat>
#include <climits>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <string>
#include <tuple>
#include <vector>

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
// for bit.
void ExpectRoundTrip(KvtHandle tree) {
    const std::string text = Written(tree);
    KvtHandle back = Load(text);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk) << text;
    EXPECT_EQ(KvtTreeDifference(tree, back), "") << text;
    kvtClose(&back);
}

// Every syntax error with its place, one case per message and path; what was
// read before the error stays (but not a keyword without any value), so that
// the tree writes and loads back.
TEST(KvtSyntax, EveryErrorWithItsPlaceAndTheTreeBeforeIt) {
    const std::string value = "expected a value: a number, true, false, \"text\" or file(\"name\")";
    const std::string afterValue = " expected ',' or the end of the line after a value";
    const struct {
        std::string text, error, stays = "";
    } cases[] = {
        {"T {\n  A {\n    key 5\n  }\n}\n", "3:9 expected '=' after a keyword name"},
        {"T {\n  key = \"open\n}\n", "2:9 unterminated text"},
        {"T {\n}\n}\n", "3:1 '}' without an open block"},
        {"T {\n  A {\n    B {\n    }\n", "2:3 a section was not closed"},
        {"T {\n  k = 1\n", "1:1 a target was not closed"},
        {"T {\n  a = 1\n  b =\n}\n", "3:6 expected a value after '='", "T {\n    a = 1\n}\n"},
        {"T {\n  k = 1,\n}\n", "2:9 expected a value after ','"},
        {"T {\n  k = 1 2\n  j =\n", "2:9" + afterValue},  // only the first error counts
        {"T {\n} k = 1\n", "2:3 a keyword must stand inside a target"},
        {"T {\n  9k = 1\n}\n", "2:3 expected a name"},
        {"T {\n  { k = 1 }\n}\n", "2:3 expected a name before '{'"},
        {"T\nU {\n}\n", "1:2 expected '{' after a target name"},
        {"T {\n  lonely\n  k = 1\n}\n", "2:9 expected '=' or '{' after a name"},
        {"T {\n  a = 1\n  S {\n    b = 2, 3, oops\n    c = 4\n  }\n}\nU { }\n", "4:15 " + value,
         "T {\n    a = 1\n    S {\n        b = 2, 3\n    }\n}\n"},
        {"T {\n  k = 1.5e\n}\n", "2:7 malformed number"},
        {"T {\n  k = 1.2.3\n}\n", "2:7 malformed number"},
        {"T {\n  k = -\n}\n", "2:7 malformed number"},
        {"T {\n  k = -infinity\n}\n", "2:7 malformed number"},
        {"T {\n  k = 9223372036854775808\n}\n", "2:7 integer out of range"},
        {"T {\n  k = -1e999\n}\n", "2:7 real out of range"},
        {"T {\n  k = file(\"a\"\n}\n", "2:15 expected ')' after the file name"},
        {"T {\n  k = file(a)\n}\n", "2:12 expected a quoted name after 'file('"},
        {std::string("T {\n  k = \"a\0b\"\n}\n", 18), "2:9 a text can't hold a NUL character"},
        // Columns count characters, not bytes, and a tab is one.
        {"T {\n\tk = \"é≈\" x\n}\n", "2:11" + afterValue},
    };
    for (const auto& c : cases) {
        KvtHandle file = Load(c.text);
        EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrSyntax) << c.text;
        EXPECT_EQ(SyntaxError(file), c.error) << c.text;
        if (!c.stays.empty()) {
            EXPECT_EQ(Written(file), c.stays);
        }
        ExpectRoundTrip(file);
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
    ExpectRoundTrip(file);
    kvtClose(&file);
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
    EXPECT_EQ(kvtGetLevel(kvtKeywordByNameNum(node, "k", 1)), kDepth);
    EXPECT_EQ(std::string(kvtGetNameGlb(node)).size(), 1u + 2u * kDepth);
    kvtClose(&file);
}

// Building calls out of order, bad names and texts that would break a line
// are refused and add nothing. The writer gives 32-bit reals 9 digits, closes
// the blocks left open and can't write a keyword without parameters; every
// value, extremes and subnormals too, loads back bit for bit.
TEST(KvtBuilding, BuiltTreeWrittenAndLoadedBack) {
    KvtHandle file = 0;
    kvtCreate(&file);
    EXPECT_EQ(kvtAddKeyword(file, "k"), kKvtErrBuild);  // no target open
    for (const char* bad : {"1bad", "a-b", static_cast<const char*>(nullptr)})
        EXPECT_EQ(kvtAddTarget(file, bad), kKvtErrName) << (bad ? bad : "null");
    ASSERT_EQ(kvtAddTarget(file, "M"), kKvtOk);
    EXPECT_EQ(kvtAddTarget(file, "U"), kKvtErrBuild);  // a target is open
    EXPECT_EQ(kvtAddInt(file, 1), kKvtErrBuild);       // no keyword yet
    ASSERT_EQ(kvtAddSection(file, "S"), kKvtOk);
    kvtAddKeyword(file, "d");
    for (double d : {0.1, -0.0, DBL_MAX, 4.9e-324, 1e21}) ASSERT_EQ(kvtAddDouble(file, d), kKvtOk);
    kvtAddKeyword(file, "f");
    for (float f : {1.1f, 1e-45f, 3.0f}) ASSERT_EQ(kvtAddFloat(file, f), kKvtOk);
    kvtAddKeyword(file, "i");
    kvtAddInt(file, INT32_MIN);
    kvtAddBool(file, true);
    ASSERT_EQ(kvtAddSection(file, "N"), kKvtOk);
    EXPECT_EQ(kvtAddInt(file, 1), kKvtErrBuild);  // the keyword ended with the section
    kvtAddKeyword(file, "t");
    EXPECT_EQ(kvtAddString(file, "two\nlines"), kKvtErrBuild);
    EXPECT_EQ(kvtAddFilename(file, nullptr), kKvtErrBuild);
    ASSERT_EQ(kvtAddString(file, "q \" b \\"), kKvtOk);
    kvtAddFilename(file, "../d/x y.xol2");
    kvtEndSection(file);
    kvtAddKeyword(file, "a");
    kvtAddBool(file, false);
    kvtEndSection(file);
    kvtEndSection(file);
    EXPECT_EQ(kvtEndSection(file), kKvtErrBuild);
    ASSERT_EQ(kvtAddTarget(file, "SECOND"), kKvtOk);
    EXPECT_NE(Written(file).find("\n        f = 1.10000002, 1.40129846e-45, 3.0\n"),
              std::string::npos);
    ExpectRoundTrip(file);
    EXPECT_EQ(kvtWrite(file, "/no/such/folder/x.kvt"), kKvtErrFile);
    EXPECT_EQ(Written(Target(file, "SECOND")), "error " + std::to_string(kKvtErrHandle));
    kvtAddKeyword(file, "Empty");
    EXPECT_EQ(Written(file), "error " + std::to_string(kKvtErrBuild));
    kvtClose(&file);
}

// Instances, numbers and levels; a keyword and a section of one name are told
// apart; look-ups that find nothing give 0 and kKvtErrNotFound.
TEST(KvtLookups, ByNameInstanceAndNumber) {
    KvtHandle file =
        Load("T {\n A {\n  k = 1\n  k = 2, 5\n  B { x = 1 }\n  k { }\n }\n A { k = 3 }\n}\n");
    const KvtHandle t = Target(file), a1 = kvtSectionByNameNum(t, "A", 1);
    EXPECT_EQ(kvtGetInt(Param(a1, "k", 2, 2)), 5);
    EXPECT_NE(kvtSectionByNameNum(a1, "k", 1), 0u);
    const auto missing = [](KvtHandle found) {
        return found == 0 && kvtPeekErrorGlb() == kKvtErrNotFound;
    };
    int n = 0;  // a braced list is evaluated in order
    for (bool missed :
         {missing(kvtTargetByNameNum(file, "T", 2)), missing(kvtTargetByNameNum(file, "T", 0)),
          missing(kvtKeywordByNameNum(a1, "k", 3)), missing(kvtSectionByNameNum(t, "a", 1)),
          missing(Param(a1, "k", 2)), missing(kvtChildByNum(a1, 5))})
        EXPECT_TRUE(missed) << n++;
    const KvtHandle k = kvtChildByNum(a1, 2), b = kvtChildByNum(a1, 3);
    EXPECT_EQ(std::to_string(kvtGetLevel(t)) + kvtGetNameGlb(k) + std::to_string(kvtGetLevel(k)) +
                  kvtGetNameGlb(b) + std::to_string(kvtGetLevel(b)),
              "0T.A.k1T.A.B2");
    EXPECT_TRUE(kvtIsKeyword(k) && !kvtIsKeyword(b));
    EXPECT_EQ(kvtChildByNum(kvtChildByNum(kvtChildByNum(a1, 1), 1), 1), 0u);  // of a parameter
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    kvtClose(&file);
}

// Big sections are searched through a name index, of keywords and sections
// apart, also for children added after the index was made. Texts handed out
// stay valid while the tree grows, short ones (kept inside their node) too.
TEST(KvtLookups, BigSectionsFindEveryInstanceAndTextsStayValid) {
    KvtHandle file = 0;
    kvtCreate(&file);
    kvtAddTarget(file, "T");
    kvtAddKeyword(file, "s");
    kvtAddString(file, "v");
    const KvtHandle t = Target(file), s = kvtKeywordByNameNum(t, "s", 1);
    const char* texts[] = {kvtGetName(s), kvtGetNameGlb(s), kvtGetString(kvtParamByNum(s, 1))};
    for (int i = 0; i < 600; ++i) {
        kvtAddKeyword(file, ("k" + std::to_string(i % 200)).c_str());
        kvtAddInt(file, i);
    }
    for (int i = 0; i < 600; ++i)
        ASSERT_EQ(kvtGetInt(Param(t, ("k" + std::to_string(i % 200)).c_str(), 1, 1 + i / 200)), i);
    kvtAddKeyword(file, "k7");
    kvtAddInt(file, -1);
    kvtAddSection(file, "k8");
    EXPECT_EQ(kvtGetInt(Param(t, "k7", 1, 4)), -1);
    EXPECT_TRUE(kvtSectionByNameNum(t, "k8", 1) != 0 && kvtKeywordByNameNum(t, "k8", 4) == 0);
    EXPECT_TRUE(Same(texts[0], "s") && Same(texts[1], "T.s") && Same(texts[2], "v"));
    EXPECT_EQ(kvtGetNameGlb(s), texts[1]);  // made once
    kvtClose(&file);
}

// Each call's outcome and the error code right after it (a braced list is
// evaluated in order): an integer may be read as a real and a text as a file
// name; every other mismatch, an integer beyond 32 bits and an unfit handle
// give 0, false or null. Only the file handle ends a tree; then its handles
// are refused.
TEST(KvtValues, KindsConversionsHandlesAndTheErrorCode) {
    KvtHandle file = Load(
        "T {\n i = 7, 3000000000, -2147483648, 18014399583223809\n r = 0.1\n b = true\n s = \"x\"\n"
        " f = file(\"d/b.nc\")\n}\n");
    // Handles taken beforehand, so that no look-up sets the code between the calls.
    const KvtHandle t = Target(file), p = Param(t, "i"), i2 = Param(t, "i", 2);
    const KvtHandle i3 = Param(t, "i", 3), r = Param(t, "r"), b = Param(t, "b"), s = Param(t, "s");
    const KvtHandle f = Param(t, "f"), i4 = Param(t, "i", 4);
    // The code after each call, -1 for a wrong outcome.
    const auto code = [](bool right) { return right ? kvtPeekErrorGlb() : -1; };
    const std::tuple<int, int, const char*> calls[] = {
        {code(kvtGetDouble(p) == 7.0), kKvtOk, "real of an integer"},
        {code(kvtGetInt(r) == 0), kKvtErrKind, "integer of a real"},
        {code(kvtGetInt(i2) == 0), kKvtErrRange, "beyond 32 bits"},
        {code(kvtGetInt(i3) == INT_MIN), kKvtOk, "least 32-bit"},
        // 2^54 + 2^30 + 1 rounds once, up; through a double it would round
        // twice and tie down to 2^54.
        {code(kvtGetFloat(i4) == 0x1.000002p54f), kKvtOk, "32-bit real of a wide integer"},
        {code(!kvtGetBool(p)), kKvtErrKind, "logical of an integer"},
        {code(kvtGetDouble(b) == 0.0), kKvtErrKind, "real of a logical"},
        {code(Same(kvtGetFilename(s), "x")), kKvtOk, "file of a text"},
        {code(!kvtGetString(f)), kKvtErrKind, "text of a file name"},
        {code(!kvtGetFilename(r)), kKvtErrKind, "file name of a real"},
        {code(kvtIsFilename(f) && !kvtIsString(f) && !kvtIsReal(p)), kKvtOk, "kinds"},
        {code(kvtGetInt(t) == 0), kKvtErrHandle, "value of a target"},
        {code(kvtAddKeyword(t, "x") == kKvtErrHandle), kKvtErrHandle, "building"},
        {code(kvtTargetByNameNum(0, "T", 1) == 0), kKvtErrHandle, "null handle"},
        {code(kvtGetInt(file + 1000) == 0), kKvtErrHandle, "beyond the nodes"},
    };
    for (const auto& [got, expected, what] : calls) EXPECT_EQ(got, expected) << what;
    KvtHandle notFile = t;
    kvtClose(&notFile);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtGetInt(p), 7);
    kvtClose(&file);
    EXPECT_TRUE(file == 0 && kvtGetInt(p) == 0 && kvtPeekErrorGlb() == kKvtErrHandle);
}

// Relative file names are taken from the folder of the file; a path too
// long is refused, not cut. A folder can't be loaded.
TEST(KvtFiles, RelativeAndAbsoluteNamesAndUnreadableFiles) {
    KvtHandle file = Load(
        "T {\n f = file(\"d/./b.nc\"), file(\"../up/c.nc\"), file(\"/abs/x/../c.nc\"), "
        "\"s.nc\", \"" +
            std::string(2100, 'n') + "\"\n}\n",
        "/models/run/model.bw");
    const char* paths[] = {"/models/run/d/b.nc", "/models/up/c.nc", "/abs/c.nc", "/models/run/s.nc",
                           nullptr};
    for (int n = 1; n <= 5; ++n)
        EXPECT_STREQ(kvtGetResultFilenamePath(Param(Target(file), "f", n)), paths[n - 1]);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrRange);
    kvtClose(&file);
    file = 123;
    EXPECT_EQ(kvtLoadFile(fs::temp_directory_path().c_str(), -1, &file), 0u);
    EXPECT_EQ(file, 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrFile);
    EXPECT_STREQ(kvtGetFileErrorText(), "Is a directory");
    // The reason is kept for a file that is there but can't be read, and
    // cleared by the next load; an absent file has none.
    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "locked.bw", "T {\n}\n");
    fs::permissions(dir / "locked.bw", fs::perms::none);
    if (geteuid() != 0) {  // root reads any file
        EXPECT_EQ(kvtLoadFile((dir / "locked.bw").c_str(), -1, &file), 0u);
        EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrFile);
        EXPECT_STREQ(kvtGetFileErrorText(), "Permission denied");
    }
    EXPECT_EQ(kvtLoadFile((dir / "absent.bw").c_str(), -1, &file), 0u);
    EXPECT_STREQ(kvtGetFileErrorText(), "");
    EXPECT_EQ(kvtLoadFile("/dev/null", -1, &file), 0u);
    EXPECT_STREQ(kvtGetFileErrorText(), "not a regular file");
}

// Lines of names (a block opening lines below its name counts from the
// name), read marks set by the look-ups by name only, and the names asked for
// in each node: found or not, each once, keywords told from sections. A peek
// reads nothing.
TEST(KvtMarks, LinesMarksAskedNamesAndTexts) {
    KvtHandle file = Load(
        "# head\nT {\n  S\n  {\n    k = 1, 2.5, 1e40, -inf, \"a \\\"b\\\"\", file(\"x.nc\"), true\n"
        "  }\n  k = 9\n}\n");
    const KvtHandle t = kvtChildByNum(file, 1), s = kvtChildByNum(t, 1);
    const KvtHandle k = kvtChildByNum(s, 1), top = kvtChildByNum(t, 2);
    EXPECT_EQ(std::to_string(kvtGetLine(t)) + std::to_string(kvtGetLine(s)) +
                  std::to_string(kvtGetLine(k)) + std::to_string(kvtGetLine(top)),
              "2357");
    EXPECT_FALSE(kvtIsRead(t) || kvtIsRead(s) || kvtIsRead(k) || kvtIsRead(top));
    EXPECT_EQ(kvtKeywordPeek(t, "k", 1), top);
    EXPECT_EQ(kvtGetAskedName(t, 1, nullptr), nullptr);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrNotFound);
    EXPECT_EQ(Target(file), t);
    EXPECT_EQ(kvtSectionByNameNum(t, "S", 2), 0u);  // asked, not found
    EXPECT_EQ(kvtKeywordByNameNum(t, "S", 1), 0u);  // a keyword of the section's name
    EXPECT_EQ(kvtSectionByNameNum(t, "S", 1), s);   // asked again: kept once
    EXPECT_EQ(kvtKeywordByNameNum(t, "Gone", 1), 0u);
    EXPECT_TRUE(kvtIsRead(t) && kvtIsRead(s) && !kvtIsRead(k) && !kvtIsRead(top));
    std::string asked;
    bool keyword = false;
    for (int n = 1; const char* name = kvtGetAskedName(t, n, &keyword); ++n)
        asked += std::string(keyword ? "k:" : "s:") + name + " ";
    EXPECT_EQ(asked, "s:S k:S k:Gone ");
    EXPECT_STREQ(kvtGetAskedName(file, 1, &keyword), "T");
    EXPECT_FALSE(keyword);

    // Parameters as messages show them; a built tree has no lines.
    std::string texts;
    for (int n = 1; n <= kvtParamCount(k); ++n)
        texts += std::string(kvtGetParamText(kvtParamByNum(k, n))) + "|";
    EXPECT_EQ(texts, "1|2.5|1e+40|-inf|\"a \\\"b\\\"\"|file(\"x.nc\")|true|");
    EXPECT_EQ(kvtGetParamText(k), nullptr);
    kvtClose(&file);
    kvtCreate(&file);
    kvtAddTarget(file, "B");
    EXPECT_EQ(kvtGetLine(Target(file, "B")), 0);
    kvtClose(&file);
}

// The texts the report gives a file a run has read in part.
std::vector<std::string> Report(KvtHandle file) {
    std::vector<std::string> texts;
    const int count = kvtReportUnread(
        file,
        [](const char* text, void* data) {
            static_cast<std::vector<std::string>*>(data)->push_back(text);
        },
        &texts);
    EXPECT_EQ(count, static_cast<int>(texts.size()));
    return texts;
}

// What a run leaves unread, in file order: a misspelt key and one in the
// wrong case get the nearest name of their kind asked for in their section,
// a far name none; an unread section is one warning for all it holds; a repeat of a
// key or section that was read names both lines, one warning per repeat; a
// second instance read by its number is no repeat; an unread target too.
TEST(KvtReport, UnreadNamesWithTheNearestAskedAndRepeats) {
    KvtHandle file = Load(
        "MODEL {\n"                        // 1
        "  Period {\n"                     // 2
        "    Time_step_intervall = 0.1\n"  // 3
        "    time_step_count = 40\n"       // 4
        "    Depth = 3\n"                  // 5
        "    Warm_up = 1\n"                // 6
        "    Warm_up = 2\n"                // 7
        "    Warm_up = 3\n"                // 8
        "    Point = 1\n"                  // 9
        "    Point = 2\n"                  // 10
        "  }\n"                            // 11
        "  Extra { a = 1\n b = 2 }\n"      // 12, 13
        "  Period { c = 1 }\n"             // 14
        "  Data_File { c = 1 }\n"          // 15
        "}\n"                              // 16
        "OTHER { }\n");                    // 17
    const KvtHandle model = Target(file, "MODEL"), period = kvtSectionByNameNum(model, "Period", 1);
    for (const char* name : {"Time_step_interval", "Time_step_count", "Warm_up", "Colors"})
        kvtKeywordByNameNum(period, name, 1);
    kvtKeywordByNameNum(period, "Point", 1);
    kvtKeywordByNameNum(period, "Point", 2);
    kvtSectionByNameNum(model, "DATA_FILE", 1);
    EXPECT_EQ(Report(file),
              (std::vector<std::string>{
                  "Key Time_step_intervall in section Period (line 3) is not read by this run; "
                  "did you mean Time_step_interval?",
                  "Key time_step_count in section Period (line 4) is not read by this run; did "
                  "you mean Time_step_count?",
                  "Key Depth in section Period (line 5) is not read by this run",
                  "Key Warm_up in section Period is given twice, on lines 6 and 7; the one on "
                  "line 6 stands",
                  "Key Warm_up in section Period is given twice, on lines 6 and 8; the one on "
                  "line 6 stands",
                  "Section Extra in target MODEL (line 12) is not read by this run",
                  "Section Period in target MODEL is given twice, on lines 2 and 14; the one on "
                  "line 2 stands",
                  "Section Data_File in target MODEL (line 15) is not read by this run; did you "
                  "mean DATA_FILE?",
                  "Target OTHER (line 17) is not read by this run",
              }));
    // A section found shows what it holds; a target found is read.
    kvtTargetByNameNum(file, "OTHER", 1);
    kvtSectionByNameNum(model, "Extra", 1);
    const std::vector<std::string> after = Report(file);
    ASSERT_EQ(after.size(), 9u);
    EXPECT_EQ(after[5] + "/" + after[6],
              "Key a in section Extra (line 12) is not read by this run/"
              "Key b in section Extra (line 13) is not read by this run");
    // Given a section, only what it holds; a keyword is no place to report on.
    EXPECT_EQ(Report(kvtSectionByNameNum(model, "Extra", 1)),
              (std::vector<std::string>{after[5], after[6]}));
    EXPECT_EQ(Report(kvtKeywordByNameNum(period, "Depth", 1)), std::vector<std::string>{});
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    kvtClose(&file);
}

}  // namespace
