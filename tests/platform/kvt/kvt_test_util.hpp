// Helpers of the parameter library's tests.
#pragma once

#include <string>

#include "platform/kvt/kvt.hpp"

namespace kvttest {

// Loads a text as if it were the file at path.
inline KvtHandle Load(const std::string& text, const std::string& path = "/models/model.bw") {
    KvtHandle file = 0;
    kvtLoadText(text.data(), text.size(), path.c_str(), &file);
    return file;
}

// Parameter number of instance of key in section.
inline KvtHandle Param(KvtHandle section, const char* key, int number = 1, int instance = 1) {
    return kvtParamByNum(kvtKeywordByNameNum(section, key, instance), number);
}

inline KvtHandle Target(KvtHandle file, const char* name = "T") {
    return kvtTargetByNameNum(file, name, 1);
}

}  // namespace kvttest
