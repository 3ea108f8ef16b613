// What the two faces of the parameter access layer share: fetching one
// parameter by the common rule, and the pieces of the log's echo.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/kvt/kvt.hpp"

enum class KvtKind { Double, Real, Integer, Logical, String, Filename };

struct KvtFetched {
    double number = 0.0;
    int32_t integer = 0;
    bool logical = false;
    std::string text;
};

// Fetches parameter param of a keyword as kind. Returns 0 when the value was
// taken, 1 when the keyword has no such parameter, else the library's code.
int KvtGetParam(KvtHandle keyword, int param, KvtKind kind, KvtFetched& out);
// Looks the key up and fetches its parameter; echo gets the start of the
// log line (indentation, key, " : ") and present whether the key is there.
int KvtGetKey(KvtHandle section, std::string_view key, int instance, int param, KvtKind kind,
              KvtFetched& out, std::string& echo, bool& present);
// Completes the echo line with the value, or the default and " (default)",
// writes it, and sets the status.
void FinishGetter(std::string& echo, bool present, int code, const std::string& valueText,
                  const std::string& defaultText, int* status);
void WriteSectionHeading(KvtHandle parent, const std::string& section);
std::string LogicalText(bool value);
std::string PathForEcho(const std::string& path);
