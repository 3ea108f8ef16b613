// Look-ups, values and the error code, file names, handles and the building
// calls of the parameter library.
#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <filesystem>
#include <string>

#include "platform/kvt/kvt.hpp"
#include "platform/kvt/kvt_test_util.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;
using kvttest::Load;
using kvttest::Param;
using kvttest::Target;

namespace {

TEST(KvtLookups, InstancesLevelsAndNames) {
    KvtHandle file =
        Load("T {\n A {\n  k = 1\n  k = 2\n  B { x = 1 }\n  k { }\n }\n A { k = 3 }\n}\nT { }\n");
    const KvtHandle t = Target(file);
    EXPECT_NE(kvtTargetByNameNum(file, "T", 2), 0u);
    EXPECT_EQ(kvtTargetByNameNum(file, "T", 3), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrNotFound);
    EXPECT_EQ(kvtTargetByNameNum(file, "T", 0), 0u);
    const KvtHandle a1 = kvtSectionByNameNum(t, "A", 1);
    const KvtHandle a2 = kvtSectionByNameNum(t, "A", 2);
    EXPECT_EQ(kvtGetInt(Param(a1, "k", 1, 2)), 2);
    EXPECT_EQ(kvtGetInt(Param(a2, "k")), 3);
    EXPECT_EQ(kvtKeywordByNameNum(a1, "k", 3), 0u);  // the section k is no keyword
    EXPECT_NE(kvtSectionByNameNum(a1, "k", 1), 0u);  // but a section
    EXPECT_EQ(kvtSectionByNameNum(t, "a", 1), 0u);   // names are matched as written
    EXPECT_EQ(kvtKeywordByNameNum(t, "A", 1), 0u);
    const KvtHandle b = kvtSectionByNameNum(a1, "B", 1);
    EXPECT_EQ(kvtGetLevel(t), 0);
    EXPECT_EQ(kvtGetLevel(a1), 1);
    EXPECT_EQ(kvtGetLevel(b), 2);
    EXPECT_EQ(kvtGetLevel(kvtKeywordByNameNum(a1, "k", 1)), 1);
    EXPECT_STREQ(kvtGetNameGlb(b), "T.A.B");
    EXPECT_STREQ(kvtGetNameGlb(kvtKeywordByNameNum(b, "x", 1)), "T.A.B.x");
    EXPECT_STREQ(kvtGetName(b), "B");
    EXPECT_EQ(Param(a1, "k", 2), 0u);  // one parameter only
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrNotFound);
    kvtClose(&file);
}

TEST(KvtLookups, WalkInFileOrder) {
    KvtHandle file = Load("T {\n a = 1, 2\n S { }\n b = 3\n}\nU { }\n");
    EXPECT_STREQ(kvtGetName(kvtChildByNum(file, 2)), "U");
    EXPECT_EQ(kvtChildByNum(file, 3), 0u);
    const KvtHandle t = kvtChildByNum(file, 1);
    const char* expected[] = {"a", "S", "b"};
    for (int n = 1; n <= 3; ++n) {
        const KvtHandle child = kvtChildByNum(t, n);
        EXPECT_STREQ(kvtGetName(child), expected[n - 1]);
        EXPECT_EQ(kvtIsKeyword(child), n != 2);
    }
    EXPECT_EQ(kvtChildByNum(t, 4), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrNotFound);
    EXPECT_EQ(kvtGetInt(kvtChildByNum(kvtChildByNum(t, 1), 2)), 2);
    EXPECT_EQ(kvtChildByNum(kvtChildByNum(kvtChildByNum(t, 1), 1), 1), 0u);  // a parameter
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    kvtClose(&file);
}

// Big sections are searched through a name index: every instance must still
// be the right one, also when the index exists before more children come.
TEST(KvtLookups, BigSectionsFindEveryInstance) {
    std::string text = "T {\n";
    for (int i = 0; i < 4; ++i)
        for (int k = 0; k < 2500; ++k)
            text += "  k" + std::to_string(k) + " = " + std::to_string(i * 10000 + k) + "\n";
    text += "  k7 { x = 1 }\n}\n";
    KvtHandle file = Load(text);
    ASSERT_EQ(kvtPeekErrorGlb(), kKvtOk);
    const KvtHandle t = Target(file);
    for (int k = 0; k < 2500; ++k) {
        const std::string name = "k" + std::to_string(k);
        for (int i = 1; i <= 4; ++i)
            ASSERT_EQ(kvtGetInt(Param(t, name.c_str(), 1, i)), (i - 1) * 10000 + k) << name << i;
        ASSERT_EQ(kvtKeywordByNameNum(t, name.c_str(), 5), 0u);
    }
    EXPECT_NE(kvtSectionByNameNum(t, "k7", 1), 0u);
    EXPECT_EQ(kvtSectionByNameNum(t, "k8", 1), 0u);
    kvtClose(&file);

    kvtCreate(&file);
    kvtAddTarget(file, "T");
    for (int i = 0; i < 40; ++i) {
        kvtAddKeyword(file, "a");
        kvtAddInt(file, i);
    }
    EXPECT_EQ(kvtGetInt(Param(Target(file), "a", 1, 40)), 39);
    kvtAddKeyword(file, "a");
    kvtAddInt(file, 40);
    EXPECT_EQ(kvtGetInt(Param(Target(file), "a", 1, 41)), 40);
    kvtClose(&file);
}

TEST(KvtValues, KindsConversionsAndTheErrorCode) {
    KvtHandle file = Load(
        "T {\n i = 7, 3000000000, -2147483648\n r = 2.5, 0.1, 1e300\n b = true\n s = \"x\"\n"
        " f = file(\"d/b.nc\")\n}\n");
    const KvtHandle t = Target(file);
    EXPECT_EQ(kvtGetDouble(Param(t, "i")), 7.0);  // an integer may be read as a real
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(kvtGetFloat(Param(t, "i")), 7.0f);
    EXPECT_EQ(kvtGetInt(Param(t, "r")), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrKind);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrKind);  // peeking never clears
    EXPECT_EQ(kvtGetFloat(Param(t, "r")), 2.5f);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);  // a call that succeeds clears it
    EXPECT_EQ(kvtGetFloat(Param(t, "r", 2)), 0.1f);
    EXPECT_EQ(kvtGetFloat(Param(t, "r", 3)), HUGE_VALF);
    EXPECT_EQ(kvtGetInt(Param(t, "i", 2)), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrRange);
    EXPECT_EQ(kvtGetDouble(Param(t, "i", 2)), 3e9);
    EXPECT_EQ(kvtGetInt(Param(t, "i", 3)), INT_MIN);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);

    // Every other mismatch is an error, with 0, false or null. (A braced list
    // is evaluated in order: each code is read right after its call.)
    const struct {
        bool zero;
        int error;
        const char* what;
    } mismatches[] = {
        {!kvtGetBool(Param(t, "i")), kvtPeekErrorGlb(), "logical of an integer"},
        {kvtGetDouble(Param(t, "b")) == 0.0, kvtPeekErrorGlb(), "real of a logical"},
        {kvtGetInt(Param(t, "s")) == 0, kvtPeekErrorGlb(), "integer of a text"},
        {kvtGetString(Param(t, "f")) == nullptr, kvtPeekErrorGlb(), "text of a file name"},
        {kvtGetFilename(Param(t, "r")) == nullptr, kvtPeekErrorGlb(), "file name of a real"},
    };
    for (const auto& m : mismatches) {
        EXPECT_TRUE(m.zero) << m.what;
        EXPECT_EQ(m.error, kKvtErrKind) << m.what;
    }
    const KvtHandle f = Param(t, "f");
    EXPECT_EQ(kvtGetFilename(Param(t, "r")), nullptr);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrKind);
    EXPECT_TRUE(kvtIsFilename(f));  // a kind query resets it too
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);

    EXPECT_TRUE(kvtGetBool(Param(t, "b")));
    EXPECT_STREQ(kvtGetFilename(Param(t, "f")), "d/b.nc");
    EXPECT_STREQ(kvtGetFilename(Param(t, "s")), "x");  // a text is a file name as well
    EXPECT_FALSE(kvtIsString(Param(t, "f")));
    EXPECT_FALSE(kvtIsReal(Param(t, "i")));
    // A missing key after a bad value: the error tells the latest outcome.
    EXPECT_EQ(kvtGetInt(Param(t, "s")), 0);
    EXPECT_EQ(kvtKeywordByNameNum(t, "none", 1), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrNotFound);
    kvtClose(&file);
}

TEST(KvtFiles, RelativeAndAbsoluteNames) {
    KvtHandle file = Load(
        "T {\n f = file(\"d/./b.nc\"), file(\"../up/c.nc\"), file(\"/abs/x/../c.nc\"), "
        "\"s.nc\"\n}\n",
        "/models/run/model.bw");
    const KvtHandle t = Target(file);
    EXPECT_STREQ(kvtGetResultFilenamePath(Param(t, "f", 1)), "/models/run/d/b.nc");
    EXPECT_STREQ(kvtGetResultFilenamePath(Param(t, "f", 2)), "/models/up/c.nc");
    EXPECT_STREQ(kvtGetResultFilenamePath(Param(t, "f", 3)), "/abs/c.nc");
    EXPECT_STREQ(kvtGetResultFilenamePath(Param(t, "f", 4)), "/models/run/s.nc");
    EXPECT_STREQ(kvtGetFilename(Param(t, "f", 2)), "../up/c.nc");  // as written
    kvtClose(&file);

    // A loaded file: its own folder. A text or tree without a path: the working folder.
    bwtest::TempDir dir;
    bwtest::WriteFile(dir / "m.kvt", "T { f = file(\"x/y.nc\") }\n");
    kvtLoadFile((dir / "m.kvt").c_str(), -1, &file);
    EXPECT_EQ(fs::path(kvtGetResultFilenamePath(Param(Target(file), "f"))),
              (fs::canonical(dir.path) / "x/y.nc").lexically_normal());
    kvtClose(&file);
    const std::string text = "T { f = file(\"y.nc\") }\n";
    kvtLoadText(text.data(), text.size(), nullptr, &file);
    EXPECT_EQ(fs::path(kvtGetResultFilenamePath(Param(Target(file), "f"))),
              fs::current_path() / "y.nc");
    kvtClose(&file);

    // A path beyond 2047 characters is refused, not cut.
    const std::string longName(2100, 'n');
    file = Load("T { f = \"" + longName + "\" }\n");
    EXPECT_EQ(kvtGetResultFilenamePath(Param(Target(file), "f")), nullptr);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrRange);
    kvtClose(&file);
}

TEST(KvtFiles, UnreadableFiles) {
    KvtHandle file = 123;
    EXPECT_EQ(kvtLoadFile("/no/such/file.bw", -1, &file), 0u);
    EXPECT_EQ(file, 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrFile);
    bwtest::TempDir dir;
    EXPECT_EQ(kvtLoadFile(dir.path.c_str(), -1, &file), 0u);  // a folder
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrFile);
    bwtest::WriteFile(dir / "empty.kvt", "");
    EXPECT_NE(kvtLoadFile((dir / "empty.kvt").c_str(), -1, &file), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(kvtChildByNum(file, 1), 0u);
    kvtClose(&file);
}

TEST(KvtHandles, StaleAndUnfitHandlesAreErrorsNotCrashes) {
    KvtHandle file = Load("T { k = 1 }\n");
    KvtHandle other = Load("T { k = 1 }\n");
    const KvtHandle t = Target(file);
    const KvtHandle p = Param(t, "k");
    EXPECT_EQ(kvtKeywordByNameNum(p, "k", 1), 0u);  // a parameter has no keywords
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtGetName(p), nullptr);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtGetInt(t), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtAddKeyword(t, "x"), kKvtErrHandle);  // building takes the file handle
    // Only the file handle ends a tree.
    KvtHandle notFile = t;
    kvtClose(&notFile);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtGetInt(p), 1);
    kvtClose(&file);
    EXPECT_EQ(file, 0u);
    EXPECT_EQ(kvtGetInt(p), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    kvtClose(&file);  // twice: a null handle
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtTargetByNameNum(0, "T", 1), 0u);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    // The node number beyond the nodes of an open tree.
    EXPECT_EQ(kvtGetInt(other + 1000), 0);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrHandle);
    EXPECT_EQ(kvtGetInt(Param(Target(other), "k")), 1);
    kvtClose(&other);
}

TEST(KvtHandles, TextsStayValidWhileTheTreeGrows) {
    KvtHandle file = 0;
    kvtCreate(&file);
    kvtAddTarget(file, "Target_with_a_long_name_beyond_small_strings");
    kvtAddKeyword(file, "k");
    kvtAddString(file, "a text long enough to live outside the node itself");
    const KvtHandle t = Target(file, "Target_with_a_long_name_beyond_small_strings");
    const char* name = kvtGetName(t);
    const char* path = kvtGetNameGlb(kvtKeywordByNameNum(t, "k", 1));
    const char* text = kvtGetString(Param(t, "k"));
    const char* shortName = kvtGetName(kvtKeywordByNameNum(t, "k", 1));
    for (int i = 0; i < 5000; ++i) {
        kvtAddKeyword(file, "more");
        kvtAddInt(file, i);
    }
    EXPECT_STREQ(name, "Target_with_a_long_name_beyond_small_strings");
    EXPECT_STREQ(path, "Target_with_a_long_name_beyond_small_strings.k");
    EXPECT_STREQ(text, "a text long enough to live outside the node itself");
    EXPECT_STREQ(shortName, "k");
    EXPECT_EQ(kvtGetNameGlb(kvtKeywordByNameNum(t, "k", 1)), path);
    kvtClose(&file);
}

TEST(KvtBuilding, OutOfOrderCallsAndBadNamesAreRefused) {
    KvtHandle file = 0;
    kvtCreate(&file);
    EXPECT_EQ(kvtAddKeyword(file, "k"), kKvtErrBuild);  // no target open
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtErrBuild);
    EXPECT_EQ(kvtAddSection(file, "S"), kKvtErrBuild);
    EXPECT_EQ(kvtEndSection(file), kKvtErrBuild);
    for (const char* bad : {"1bad", "", "a-b", "a b", "é"})
        EXPECT_EQ(kvtAddTarget(file, bad), kKvtErrName) << bad;
    EXPECT_EQ(kvtAddTarget(file, nullptr), kKvtErrName);
    EXPECT_EQ(kvtAddTarget(file, "_T1"), kKvtOk);
    EXPECT_EQ(kvtPeekErrorGlb(), kKvtOk);
    EXPECT_EQ(kvtAddTarget(file, "U"), kKvtErrBuild);  // a target is open
    EXPECT_EQ(kvtAddInt(file, 1), kKvtErrBuild);       // no keyword yet
    EXPECT_EQ(kvtAddKeyword(file, "k"), kKvtOk);
    EXPECT_EQ(kvtAddString(file, "two\nlines"), kKvtErrBuild);
    EXPECT_EQ(kvtAddFilename(file, nullptr), kKvtErrBuild);
    EXPECT_EQ(kvtAddSection(file, "S"), kKvtOk);
    EXPECT_EQ(kvtAddInt(file, 1), kKvtErrBuild);  // the keyword ended with the section
    EXPECT_EQ(kvtEndSection(file), kKvtOk);
    EXPECT_EQ(kvtEndSection(file), kKvtOk);
    EXPECT_EQ(kvtEndSection(file), kKvtErrBuild);

    // The keyword k has no parameter: the tree can't be written.
    bwtest::TempDir dir;
    EXPECT_EQ(kvtWrite(file, (dir / "x.kvt").c_str()), kKvtErrBuild);
    EXPECT_FALSE(fs::exists(dir / "x.kvt"));
    EXPECT_EQ(kvtWrite(Target(file, "_T1"), (dir / "x.kvt").c_str()), kKvtErrHandle);
    kvtClose(&file);

    kvtCreate(&file);
    kvtAddTarget(file, "T");
    EXPECT_EQ(kvtWrite(file, (dir / "no/such/folder/x.kvt").c_str()), kKvtErrFile);
    EXPECT_EQ(kvtWrite(file, (dir / "open.kvt").c_str()), kKvtOk);  // open blocks are closed
    EXPECT_EQ(bwtest::ReadFile(dir / "open.kvt"), "T {\n}\n");
    kvtClose(&file);
}

}  // namespace
