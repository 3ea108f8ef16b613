// Fuzz target of the parameter library. Any input must load, or stop at a
// syntax error, without a crash. The tree is then walked through the public
// calls and checked for consistency: each node is found again by its name and
// instance, levels and paths follow the nesting, each parameter has one kind
// and the value calls agree with it. An input that loads cleanly must write
// and load back to the same tree. The report of what a run left unread gives
// one text per target before any look-up, and none once the walk has looked
// up every node by its name and instance.
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include "platform/kvt/kvt.hpp"
#include "platform/kvt/kvt_compare.hpp"

namespace {

constexpr int kPathLevels = 64;

void Check(bool ok, const char* what) {
    if (!ok) {
        std::fprintf(stderr, "kvt_fuzz: %s\n", what);
        std::abort();
    }
}

// The value calls of one parameter against its kind.
void CheckParam(KvtHandle p) {
    const bool isInt = kvtIsInt(p), isReal = kvtIsReal(p), isBool = kvtIsBool(p);
    const bool isText = kvtIsString(p), isFile = kvtIsFilename(p);
    Check(kvtPeekErrorGlb() == kKvtOk, "kind query failed");
    Check(isInt + isReal + isBool + isText + isFile == 1, "not exactly one kind");

    kvtGetInt(p);
    const int intError = kvtPeekErrorGlb();
    Check(isInt ? (intError == kKvtOk || intError == kKvtErrRange) : intError == kKvtErrKind,
          "kvtGetInt against the kind");
    kvtGetDouble(p);
    Check((kvtPeekErrorGlb() == kKvtOk) == (isInt || isReal), "kvtGetDouble against the kind");
    kvtGetFloat(p);
    Check((kvtPeekErrorGlb() == kKvtOk) == (isInt || isReal), "kvtGetFloat against the kind");
    kvtGetBool(p);
    Check((kvtPeekErrorGlb() == kKvtOk) == isBool, "kvtGetBool against the kind");
    const char* text = kvtGetString(p);
    Check((text != nullptr) == isText && (kvtPeekErrorGlb() == kKvtOk) == isText,
          "kvtGetString against the kind");
    const char* name = kvtGetFilename(p);
    Check((name != nullptr) == (isText || isFile), "kvtGetFilename against the kind");
    if (isText) Check(std::strcmp(text, name) == 0, "a text read as a file name differs");
    const char* path = kvtGetResultFilenamePath(p);
    if (isText || isFile) {
        Check(path != nullptr || kvtPeekErrorGlb() == kKvtErrRange, "no full path");
        if (path != nullptr) Check(path[0] == '/' && std::strlen(path) <= 2047, "bad full path");
    } else {
        Check(path == nullptr && kvtPeekErrorGlb() == kKvtErrKind, "full path of a non-name");
    }
}

// Walks the whole tree with a stack of its own; the first target's handle is
// returned for a check after the tree is closed.
KvtHandle Walk(KvtHandle file) {
    std::vector<KvtHandle> stack{file};
    KvtHandle first = 0;
    while (!stack.empty()) {
        const KvtHandle node = stack.back();
        stack.pop_back();
        const bool top = node == file;
        const int level = top ? -1 : kvtGetLevel(node);
        // A path costs its length, so a deep chain would cost the square of
        // its depth: paths are checked in the upper levels only.
        const bool checkPath = !top && level < kPathLevels;
        const std::string path = checkPath ? kvtGetNameGlb(node) : "";
        std::map<std::pair<bool, std::string>, int> seen;
        int number = 1;
        for (KvtHandle child; (child = kvtChildByNum(node, number)) != 0; ++number) {
            if (first == 0) first = child;
            const bool keyword = kvtIsKeyword(child);
            const std::string name = kvtGetName(child);
            const int instance = ++seen[{keyword, name}];
            if (top) {
                Check(!keyword && kvtTargetByNameNum(file, name.c_str(), instance) == child,
                      "a target not found by its name and instance");
                Check(kvtGetLevel(child) == 0 && name == kvtGetNameGlb(child), "target level");
            } else {
                const KvtHandle found = keyword ? kvtKeywordByNameNum(node, name.c_str(), instance)
                                                : kvtSectionByNameNum(node, name.c_str(), instance);
                Check(found == child, "a child not found by its name and instance");
                Check(kvtGetLevel(child) == level + (keyword ? 0 : 1), "level");
                if (checkPath) Check(path + "." + name == kvtGetNameGlb(child), "global name");
            }
            if (!keyword) {
                stack.push_back(child);
                continue;
            }
            int count = 0;
            for (KvtHandle p; (p = kvtParamByNum(child, count + 1)) != 0; ++count) CheckParam(p);
            Check(count > 0, "a keyword without parameters");
            Check(kvtChildByNum(child, count) == kvtParamByNum(child, count), "parameter walk");
        }
        Check(kvtPeekErrorGlb() == kKvtErrNotFound, "the walk ended without not-found");
        if (!top) {
            Check(kvtSectionByNameNum(node, "", 1) == 0 && kvtPeekErrorGlb() == kKvtErrNotFound,
                  "an empty name found");
        }
    }
    return first;
}

// The texts of the unread report, each checked for its form.
int UnreadTexts(KvtHandle file) {
    int count = 0;
    const int reported = kvtReportUnread(
        file,
        [](const char* text, void* data) {
            ++*static_cast<int*>(data);
            Check(std::strncmp(text, "Target ", 7) == 0 || std::strncmp(text, "Section ", 8) == 0 ||
                      std::strncmp(text, "Key ", 4) == 0,
                  "an unread text without its kind");
            Check(std::strstr(text, " is not read by this run") != nullptr ||
                      std::strstr(text, " is given twice, on lines ") != nullptr,
                  "an unread text without its finding");
        },
        &count);
    Check(reported == count && kvtPeekErrorGlb() == kKvtOk, "unread count");
    return count;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    KvtHandle file = 0;
    kvtLoadText(reinterpret_cast<const char*>(data), size, "/fuzz/model.bw", &file);
    const int error = kvtPeekErrorGlb();
    Check(file != 0 && (error == kKvtOk || error == kKvtErrSyntax), "load outcome");
    int line = 0, column = 0;
    const char* text = nullptr;
    kvtGetSyntaxErr(file, &line, &column, &text);
    if (error == kKvtErrSyntax) {
        Check(line >= 1 && column >= 1 && text != nullptr && text[0] != '\0', "error place");
        int lines = 1;
        for (size_t i = 0; i < size; ++i) lines += data[i] == '\n';
        Check(line <= lines, "error line beyond the text");
    } else {
        Check(line == 0 && column == 0 && text != nullptr && text[0] == '\0', "clean load");
    }

    int targets = 0;
    while (kvtChildByNum(file, targets + 1) != 0) ++targets;
    Check(UnreadTexts(file) == targets, "unread before any look-up");
    const KvtHandle first = Walk(file);
    Check(UnreadTexts(file) == 0, "unread after a walk by names");

    // A tree read before an error writes too; it must load back the same.
    static const std::string path = "/tmp/kvt_fuzz_" + std::to_string(getpid()) + ".kvt";
    Check(kvtWrite(file, path.c_str()) == kKvtOk, "write");
    KvtHandle back = 0;
    kvtLoadFile(path.c_str(), -1, &back);
    Check(kvtPeekErrorGlb() == kKvtOk, "a written file does not load");
    const std::string difference = KvtTreeDifference(file, back);
    if (!difference.empty()) std::fprintf(stderr, "round trip differs: %s\n", difference.c_str());
    Check(difference.empty(), "round trip");
    kvtClose(&back);

    kvtClose(&file);
    Check(file == 0, "close");
    if (first != 0) {
        Check(kvtGetName(first) == nullptr && kvtPeekErrorGlb() == kKvtErrHandle,
              "a handle of a closed tree");
    }
    return 0;
}
