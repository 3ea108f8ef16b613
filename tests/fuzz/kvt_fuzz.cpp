// Fuzz target of the parameter-file loader. Any input must load or fail with
// a syntax error without a crash; an input that loads must write and load
// back to the same tree.
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "platform/kvt/kvt.hpp"
#include "platform/kvt/kvt_compare.hpp"

namespace {

// Walks the tree through the public calls, as a reader of settings would.
void Walk(KvtHandle file) {
    for (int t = 1; t <= 3; ++t) {
        const KvtHandle target = kvtTargetByNameNum(file, "T", t);
        if (target == 0) break;
        kvtGetNameGlb(target);
        for (const char* name : {"A", "k", "T"}) {
            const KvtHandle section = kvtSectionByNameNum(target, name, 1);
            if (section != 0) kvtGetLevel(section);
            const KvtHandle keyword = kvtKeywordByNameNum(target, name, 1);
            for (int n = 1; n <= 3 && keyword != 0; ++n) {
                const KvtHandle p = kvtParamByNum(keyword, n);
                kvtGetInt(p);
                kvtGetDouble(p);
                kvtGetBool(p);
                kvtGetString(p);
                kvtGetResultFilenamePath(p);
            }
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    KvtHandle file = 0;
    kvtLoadText(reinterpret_cast<const char*>(data), size, "/fuzz/model.bw", &file);
    const int error = kvtPeekErrorGlb();
    if (error != kKvtOk && error != kKvtErrSyntax) std::abort();
    Walk(file);
    if (error == kKvtErrSyntax) {
        int line = 0, column = 0;
        const char* text = nullptr;
        kvtGetSyntaxErr(file, &line, &column, &text);
        if (line < 1 || column < 1 || text == nullptr || text[0] == '\0') std::abort();
    } else {
        static const std::string path = "/tmp/kvt_fuzz_" + std::to_string(getpid()) + ".kvt";
        if (kvtWrite(file, path.c_str()) != kKvtOk) std::abort();
        KvtHandle back = 0;
        kvtLoadFile(path.c_str(), -1, &back);
        if (kvtPeekErrorGlb() != kKvtOk) std::abort();
        const std::string difference = KvtTreeDifference(file, back);
        if (!difference.empty()) {
            std::fprintf(stderr, "round trip differs: %s\n", difference.c_str());
            std::abort();
        }
        kvtClose(&back);
    }
    kvtClose(&file);
    return 0;
}
