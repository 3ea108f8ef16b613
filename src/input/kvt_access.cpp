#include "input/kvt_access.hpp"

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <type_traits>

#include "run/messages.hpp"
#include "run/process.hpp"
#include "run/units.hpp"

KvtAccessState gKvtAccess;

namespace {

enum class KvtKind { Double, Real, Integer, Logical, String, Filename };

struct KvtFetched {
    double number = 0.0;
    int32_t integer = 0;
    bool logical = false;
    std::string text;
};

void WriteDateAndTime() {
    const std::time_t now = std::time(nullptr);
    std::tm local{};
    localtime_r(&now, &local);
    char date[16], time[16];
    std::strftime(date, sizeof date, "%Y%m%d", &local);
    std::strftime(time, sizeof time, "%H%M%S", &local);
    KvtLogLine(std::string(60, ' ') + date);
    KvtLogLine(std::string(60, ' ') + time);
}

std::string Indent(KvtHandle section) {
    const int level = kvtGetLevel(section);
    return std::string(2 * static_cast<size_t>(level + 1), ' ');
}

void WriteSectionHeading(KvtHandle parent, const std::string& section);

std::string FitWidth(std::string text, int width) {
    if (width > 0) text.resize(static_cast<size_t>(width), ' ');
    return text;
}

}  // namespace

void KvtLogLine(std::string_view text) {
    if (gKvtAccess.logUnit <= 0) return;
    FILE* log = UnitFile(gKvtAccess.logUnit);
    if (log == nullptr) return;
    text = TrimRight(text);
    std::fwrite(text.data(), 1, text.size(), log);
    std::fputc('\n', log);
    std::fflush(log);
}

std::string LogFileName(std::string_view path) {
    std::string name(TrimRight(path));
    const size_t slash = name.find_last_of('/');
    const size_t dot = name.rfind('.');
    if (dot != std::string::npos && (slash == std::string::npos || dot > slash)) name.erase(dot);
    return ProcessFileStem(name) + ".log";
}

KvtHandle KvtOpenFile(std::string_view path, bool makeLog, int* status) {
    const std::string name(TrimRight(path));
    KvtHandle file = 0;
    kvtLoadFile(name.c_str(), -1, &file);
    gKvtAccess.loadFailure = file == 0 ? kvtGetFileErrorText() : "";
    if (file == 0) {
        if (status != nullptr) {
            *status = -1;
            return 0;
        }
        if (gKvtAccess.loadFailure.empty()) StopRun("KVT file: " + name + "not found");
        StopRun("KVT file: " + name + " can not be read: " + gKvtAccess.loadFailure);
    }
    if (makeLog) {
        gKvtAccess.logName = LogFileName(name);
        const int unit = GetFreeUnit();
        if (unit > 0 && OpenUnit(unit, gKvtAccess.logName, "w")) {
            gKvtAccess.logUnit = unit;
            WriteDateAndTime();
        } else {
            if (unit > 0) ReleaseUnit(unit);
            gKvtAccess.logUnit = -1;
        }
    }
    if (status != nullptr) *status = 0;
    return file;
}

std::string KvtLoadFailure() {
    return gKvtAccess.loadFailure;
}

KvtHandle KvtOpenTarget(KvtHandle file, std::string_view name, int instance, int* status) {
    const std::string target(TrimRight(name));
    KvtLogLine("");
    KvtLogLine("");
    KvtLogLine(std::string(70, '='));
    KvtLogLine("Target: " + target);
    KvtLogLine("");
    const KvtHandle handle = kvtTargetByNameNum(file, target.c_str(), instance);
    if (handle == 0) {
        if (status == nullptr) StopRun("KVT target: " + target + " not found");
        *status = -1;
        return 0;
    }
    if (status != nullptr) *status = 0;
    return handle;
}

KvtHandle KvtOpenSection(KvtHandle parent, std::string_view name, int instance, int* status) {
    const std::string section(TrimRight(name));
    WriteSectionHeading(parent, section);
    const KvtHandle handle = kvtSectionByNameNum(parent, section.c_str(), instance);
    if (handle == 0) {
        if (status == nullptr) StopRun("KVT section: " + section + " not found");
        *status = -1;
        return 0;
    }
    if (status != nullptr) *status = 0;
    return handle;
}

namespace {

void WriteSectionHeading(KvtHandle parent, const std::string& section) {
    if (gKvtAccess.logUnit <= 0) return;
    KvtLogLine("");
    KvtLogLine("");
    const int level = parent != 0 ? kvtGetLevel(parent) : 0;
    std::string heading =
        std::string(2 * static_cast<size_t>(level > 0 ? level : 0), ' ') + "Section: " + section;
    if (heading.size() > 128) heading.resize(128);
    heading += ' ';
    if (heading.size() < 70) heading.append(70 - heading.size(), '-');
    KvtLogLine(heading);
}

int KvtGetParam(KvtHandle keyword, int param, KvtKind kind, KvtFetched& out) {
    int code = kvtPeekErrorGlb();
    if (code != 0) return code;
    const KvtHandle p = kvtParamByNum(keyword, param);
    if (p == 0) return 1;
    const char* text = nullptr;
    switch (kind) {
        case KvtKind::Double:
        case KvtKind::Real:
            out.number = kvtGetDouble(p);
            break;
        case KvtKind::Integer:
            out.integer = kvtGetInt(p);
            break;
        case KvtKind::Logical:
            if (kvtIsInt(p))
                out.logical = kvtGetInt(p) != 0;
            else
                out.logical = kvtGetBool(p);
            break;
        case KvtKind::String:
            if (kvtIsString(p))
                text = kvtGetString(p);
            else if (kvtIsFilename(p))
                text = kvtGetFilename(p);
            else
                text = kvtGetString(p);  // sets the wrong-kind code
            break;
        case KvtKind::Filename:
            text = kvtGetResultFilenamePath(p);
            break;
    }
    code = kvtPeekErrorGlb();
    if (code == 0 && (kind == KvtKind::String || kind == KvtKind::Filename)) {
        if (text == nullptr) return 1;
        out.text = text;
    }
    return code;
}

int KvtGetKey(KvtHandle section, std::string_view key, int instance, int param, KvtKind kind,
              KvtFetched& out, std::string& echo, KvtHandle& keyword) {
    const std::string name(TrimRight(key));
    echo = Indent(section) + name + " : ";
    keyword = kvtKeywordByNameNum(section, name.c_str(), instance);
    const bool present = keyword != 0;
    if (!present) return 1;
    return KvtGetParam(keyword, param, kind, out);
}

std::string LogicalText(bool value) {
    return value ? "True" : "False";
}

std::string PathForEcho(const std::string& path) {
    const char* noPath = std::getenv("TRNLIB_LOG_NOPATH");
    if (noPath == nullptr || noPath[0] == '\0') return path;
    const size_t sep = path.find_last_of("/\\");
    return sep == std::string::npos ? path : path.substr(sep + 1);
}

constexpr const char* kWholeNumber = "a whole number from -2147483648 to 2147483647 is expected";

// Why a parameter fetched with code can't be meant, or "" when it can.
std::string Unmeant(KvtKind kind, int code, const KvtFetched& f) {
    const bool range = code == kKvtErrRange;
    if (code != 0) {
        switch (kind) {
            case KvtKind::Integer:
                return std::string(range ? "is beyond the 32-bit integer range; "
                                         : "is not an integer; ") +
                       kWholeNumber;
            case KvtKind::Double:
            case KvtKind::Real:
                return "is not a number; a real or an integer is expected";
            case KvtKind::Logical:
                return std::string(range ? "is beyond the 32-bit integer range"
                                         : "is not a logical") +
                       "; true, false or an integer is expected";
            case KvtKind::String:
                return "is not a text; a quoted text is expected";
            case KvtKind::Filename:
                return range ? "is a path of more than 2047 characters; a shorter one is expected"
                             : "is not a file name; file(\"name\") or a quoted text is expected";
        }
    }
    if (kind != KvtKind::Double && kind != KvtKind::Real) return "";
    if (!std::isfinite(f.number)) return "is not a finite number";
    if (kind == KvtKind::Real && std::isinf(static_cast<float>(f.number)))
        return "is beyond the 32-bit real range; a magnitude of at most 3.4028235e+38 is expected";
    return "";
}

// Stops the run on a present key whose value can't be meant, after its echo
// line (the values as written), so that the log shows where reading stopped.
// number > 0 names the value at fault among several.
[[noreturn]] void Refuse(const char* getter, KvtHandle section, KvtHandle keyword, int number,
                         const std::string& echo, const std::string& why) {
    std::string values;
    const int count = kvtParamCount(keyword);
    for (int i = 1; i <= count; ++i)
        values += (i > 1 ? ", " : "") + std::string(kvtGetParamText(kvtParamByNum(keyword, i)));
    KvtLogLine(echo + values);
    std::string text = std::string(getter) + ": ";
    if (number > 0 && count > 1) text += "value " + std::to_string(number) + " of ";
    text += std::string(kvtGetName(keyword)) + " = " + values;
    text += (kvtGetLevel(section) == 0 ? " in target " : " in section ") +
            std::string(kvtGetName(section));
    text += " (line " + std::to_string(kvtGetLine(keyword)) + ") " + why;
    StopRun(text);
}

std::string ValueCount(int count) {
    return std::to_string(count) + (count == 1 ? " value" : " values");
}

// A check of this layer, not of the plain library (which keeps the default
// without a word): a present key whose value can't be meant stops the run.
void RefuseUnmeant(const char* getter, KvtHandle section, KvtHandle keyword, int param,
                   KvtKind kind, int code, const KvtFetched& f, const std::string& echo) {
    if (code == 1) {
        Refuse(getter, section, keyword, 0, echo,
               "gives " + ValueCount(kvtParamCount(keyword)) + " where at least " +
                   std::to_string(param) + " are needed");
    }
    const std::string why = Unmeant(kind, code, f);
    if (!why.empty()) Refuse(getter, section, keyword, param, echo, why);
}

// Ends a getter: the echo line and the status.
void FinishGetter(std::string& echo, bool present, int code, const std::string& valueText,
                  const std::string& defaultText, int* status) {
    if (present && code == 0)
        echo += valueText;
    else if (!present)
        echo += defaultText + " (default)";
    KvtLogLine(echo);
    if (status != nullptr) *status = present ? code : 1;
}

// The course of every getter: look the key up, fetch its parameter, take the
// value, and echo what was read or the default.
// Without a status a present key must hold a value that can be meant.
template <typename T, typename Take, typename ReadText, typename ValueText>
void GetSetting(const char* getter, KvtHandle section, std::string_view key, T& value, int instance,
                int param, int* status, KvtKind kind, Take take, ReadText readText,
                ValueText valueText) {
    KvtFetched f;
    std::string echo;
    KvtHandle keyword = 0;
    const int code = KvtGetKey(section, key, instance, param, kind, f, echo, keyword);
    const bool present = keyword != 0;
    if (present && status == nullptr)
        RefuseUnmeant(getter, section, keyword, param, kind, code, f, echo);
    if (present && code == 0) take(f, value);
    FinishGetter(echo, present, code, readText(f), valueText(value), status);
}

std::string FetchedNumber(const KvtFetched& f) {
    return NumberText(f.number);
}

}  // namespace

void KvtGetDouble(KvtHandle section, std::string_view key, double& value, int instance, int param,
                  int* status) {
    GetSetting(
        "KvtGetDouble", section, key, value, instance, param, status, KvtKind::Double,
        [](const KvtFetched& f, double& v) { v = f.number; }, FetchedNumber,
        [](double v) { return NumberText(v); });
}

void KvtGetReal(KvtHandle section, std::string_view key, float& value, int instance, int param,
                int* status) {
    // Read as 64 bits and echoed so; stored as 32 bits.
    GetSetting(
        "KvtGetReal", section, key, value, instance, param, status, KvtKind::Real,
        [](const KvtFetched& f, float& v) { v = static_cast<float>(f.number); }, FetchedNumber,
        [](float v) { return NumberText(static_cast<double>(v)); });
}

void KvtGetInteger(KvtHandle section, std::string_view key, int32_t& value, int instance, int param,
                   int* status) {
    GetSetting(
        "KvtGetInteger", section, key, value, instance, param, status, KvtKind::Integer,
        [](const KvtFetched& f, int32_t& v) { v = f.integer; },
        [](const KvtFetched& f) { return std::to_string(f.integer); },
        [](int32_t v) { return std::to_string(v); });
}

void KvtGetLogical(KvtHandle section, std::string_view key, bool& value, int instance, int param,
                   int* status) {
    GetSetting(
        "KvtGetLogical", section, key, value, instance, param, status, KvtKind::Logical,
        [](const KvtFetched& f, bool& v) { v = f.logical; },
        [](const KvtFetched& f) { return LogicalText(f.logical); }, LogicalText);
}

void KvtGetString(KvtHandle section, std::string_view key, std::string& value, int width,
                  int instance, int param, int* status) {
    GetSetting(
        "KvtGetString", section, key, value, instance, param, status, KvtKind::String,
        [width](const KvtFetched& f, std::string& v) { v = FitWidth(f.text, width); },
        [](const KvtFetched& f) { return std::string(TrimRight(f.text)); },
        [](const std::string& v) { return std::string(TrimRight(v)); });
}

void KvtGetFilename(KvtHandle section, std::string_view key, std::string& value, int width,
                    int instance, int param, int* status) {
    GetSetting(
        "KvtGetFilename", section, key, value, instance, param, status, KvtKind::Filename,
        [width](const KvtFetched& f, std::string& v) { v = FitWidth(f.text, width); },
        [](const KvtFetched& f) { return PathForEcho(std::string(TrimRight(f.text))); },
        [](const std::string& v) { return std::string(TrimRight(v)); });
}

std::string KvtTrimmedString(KvtHandle section, std::string_view key, int width,
                             std::string fallback) {
    KvtGetString(section, key, fallback, width);
    return std::string(TrimRight(fallback));
}

std::string KvtTrimmedFilename(KvtHandle section, std::string_view key, int width) {
    std::string value;
    KvtGetFilename(section, key, value, width);
    return std::string(TrimRight(value));
}

namespace {

// Without a status a present key must give count values, each one that can be meant.
template <typename T>
void GetList(const char* getter, KvtHandle section, std::string_view key, T* values, int count,
             KvtKind kind, int* status) {
    const std::string name(TrimRight(key));
    std::string echo = Indent(section) + name + " : ";
    const KvtHandle keyword = kvtKeywordByNameNum(section, name.c_str(), 1);
    auto text = [](T v) {
        if constexpr (std::is_same_v<T, double>)
            return NumberText(v);
        else
            return std::to_string(v);
    };
    if (keyword == 0) {
        for (int i = 0; i < count; ++i) echo += text(values[i]) + " ";
        echo = std::string(TrimRight(echo)) + " (default)";
        KvtLogLine(echo);
        if (status != nullptr) *status = 1;
        return;
    }
    const std::string head = echo;
    if (status == nullptr && kvtParamCount(keyword) < count) {
        Refuse(getter, section, keyword, 0, head,
               "gives " + ValueCount(kvtParamCount(keyword)) + " where " + std::to_string(count) +
                   " are needed");
    }
    int code = 0;
    for (int i = 0; i < count; ++i) {
        KvtFetched f;
        code = KvtGetParam(keyword, i + 1, kind, f);
        if (status == nullptr) RefuseUnmeant(getter, section, keyword, i + 1, kind, code, f, head);
        if (code != 0) continue;
        if constexpr (std::is_same_v<T, double>)
            values[i] = f.number;
        else
            values[i] = f.integer;
        echo += text(values[i]) + " ";
    }
    KvtLogLine(echo);
    if (status != nullptr) *status = code;
}

}  // namespace

void KvtGetIntegerList(KvtHandle section, std::string_view key, int32_t* values, int count,
                       int* status) {
    GetList("KvtGetIntegerList", section, key, values, count, KvtKind::Integer, status);
}

void KvtGetDoubleList(KvtHandle section, std::string_view key, double* values, int count,
                      int* status) {
    GetList("KvtGetDoubleList", section, key, values, count, KvtKind::Double, status);
}

int KvtParamCount(KvtHandle section, std::string_view key) {
    const std::string name(TrimRight(key));
    return kvtParamCount(kvtKeywordPeek(section, name.c_str(), 1));
}

void KvtWarnUnread(KvtHandle file) {
    kvtReportUnread(
        file, [](const char* text, void*) { ReportUserWarning(text); }, nullptr);
}
