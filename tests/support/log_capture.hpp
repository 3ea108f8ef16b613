// Points the message layer's log at a scratch file for the length of a test,
// so that the lines the engine writes can be read back.
#pragma once

#include <string>
#include <vector>

#include "run/messages.hpp"
#include "run/units.hpp"
#include "support/test_support.hpp"

namespace bwtest {

struct LogCapture {
    TempDir dir;
    std::string path = dir / "capture.log";
    int unit = GetFreeUnit();

    LogCapture() {
        OpenUnit(unit, path, "w");
        SetLogUnit(unit);
    }
    ~LogCapture() {
        SetLogUnit(0);
        ReleaseUnit(unit);
    }
    std::vector<std::string> Lines() {
        FlushUnits();
        return ReadLines(path);
    }
    std::string Text() {
        FlushUnits();
        return ReadFile(path);
    }
};

}  // namespace bwtest
