#include "run/messages.hpp"

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "platform/hud/hud.hpp"
#include "run/units.hpp"

MessageState gMessages;

namespace {

constexpr int kMaxCleanups = 16;
void (*gCleanups[kMaxCleanups])() = {};
int gCleanupCount = 0;

FILE* LogFile() {
    return gMessages.logUnit > 0 ? UnitFile(gMessages.logUnit) : nullptr;
}

// Writes text in pieces of pieceSize characters, the first behind lead, the
// others behind as many blanks; length / pieceSize + 1 lines in all.
void WritePieces(std::string_view text, std::string_view lead, size_t pieceSize) {
    text = TrimRight(text);
    WriteLine("");
    const size_t lines = text.size() / pieceSize + 1;
    const std::string indent(lead.size(), ' ');
    for (size_t i = 0; i < lines; ++i) {
        std::string line(i == 0 ? lead : std::string_view(indent));
        if (i * pieceSize < text.size()) line += text.substr(i * pieceSize, pieceSize);
        WriteLine(line);
    }
}

// The program's file name without folder and extension, the title of a message box.
std::string ProgramTitle() {
    std::string name = program_invocation_short_name;
    const size_t dot = name.rfind('.');
    if (dot != std::string::npos && dot > 0) name.erase(dot);
    return name;
}

void WriteClosingWords(int code) {
    const char* words = code == 0 ? "Successful completion" : "Abnormal completion";
    if (gMessages.logUnit > 0)
        WriteLine(words);
    else if (gMessages.logUnit < 0)
        std::printf("%s\n", words);  // the log is closed: tell the user
}

// Fortran-like power of ten in 32-bit reals, as the limits of FormatNumber are kept.
float PowerOfTen(int n) {
    float p = 1.0f;
    for (int i = 0; i < n; ++i) p *= 10.0f;
    return p;
}

std::string StripTrailingZeros(std::string s) {
    while (!s.empty() && s.back() == '0') s.pop_back();
    return s;
}

}  // namespace

std::string_view TrimRight(std::string_view text) {
    size_t end = text.size();
    while (end > 0 && (text[end - 1] == ' ' || text[end - 1] == '\0')) --end;
    return text.substr(0, end);
}

std::string_view Trim(std::string_view text) {
    text = TrimRight(text);
    size_t begin = 0;
    while (begin < text.size() && text[begin] == ' ') ++begin;
    return text.substr(begin);
}

void SetLogUnit(int unit) {
    gMessages.logUnit = unit;
}

void WriteLine(std::string_view text) {
    text = TrimRight(text);
    if (FILE* log = LogFile()) {
        std::fwrite(text.data(), 1, text.size(), log);
        std::fputc('\n', log);
        std::fflush(log);
    } else {
        std::fwrite(text.data(), 1, text.size(), stdout);
        std::fputc('\n', stdout);
        std::fflush(stdout);
    }
}

void WriteWrapped(std::string_view text) {
    text = TrimRight(text);
    if (text.empty()) WriteLine("");
    for (size_t pos = 0; pos < text.size(); pos += 70) WriteLine(text.substr(pos, 70));
}

void WriteLogPart(std::string_view text) {
    if (FILE* log = LogFile()) std::fwrite(text.data(), 1, text.size(), log);
}

void ReportWarning(std::string_view text) {
    WritePieces(text, "Warning: ", 61);
}

void ReportUserWarning(std::string_view text) {
    ReportWarning(text);
    if (gMessages.logUnit <= 0) return;
    const char* buildMode = std::getenv("BUILDMODE");
    if (buildMode != nullptr && std::strcmp(buildMode, "NIGHT") == 0) return;
    const std::string line(TrimRight(text));
    std::printf("Warning: %s\n", line.c_str());
    std::fflush(stdout);
}

void ReportFatal(std::string_view text) {
    WritePieces(text, "Fatal error: ", 57);
    NormalExit(kExitFatal);
}

void StopRun(std::string_view text) {
    StopRun(text, kExitFatal);
}

void StopRun(std::string_view text, int code) {
    const std::string message(TrimRight(text));
    if (gMessages.logUnit > 0) WriteLine(message);
    const char* buildMode = std::getenv("BUILDMODE");
    if (buildMode == nullptr || std::strcmp(buildMode, "NIGHT") != 0) {
        const char* trf = std::getenv("TRF");
        const bool hud = trf != nullptr && std::strcmp(trf, "HUD") == 0;
        const bool win = trf != nullptr && std::strcmp(trf, "WIN") == 0;
        if (!hud && !win) {
            std::printf("%s\n", message.c_str());
            std::fflush(stdout);
        } else {
            // "WIN" asks for a message box; on this platform it is the same text on standard error.
            hudMessage(message.c_str(), ProgramTitle().c_str(), kHudStyleStop);
        }
    }
    if (gMessages.logUnit > 0) WriteClosingWords(code);
    RunExitCleanups();
    FlushUnits();
    hudExit(code);
}

void NormalExit(int code) {
    WriteClosingWords(code);
    RunExitCleanups();
    FlushUnits();
    hudExit(code);
}

void AddExitCleanup(void (*cleanup)()) {
    for (int i = 0; i < gCleanupCount; ++i)
        if (gCleanups[i] == cleanup) return;
    if (gCleanupCount < kMaxCleanups) gCleanups[gCleanupCount++] = cleanup;
}

void RunExitCleanups() {
    // Taken one by one off the list, so that a cleanup that stops again cannot loop.
    while (gCleanupCount > 0) gCleanups[--gCleanupCount]();
}

// ---- '%' patterns ---------------------------------------------------------

void FillPercent(std::string& out, std::string_view pattern, std::string_view value) {
    const size_t pos = pattern.find('%');
    if (pos == std::string_view::npos) return;
    std::string filled(pattern.substr(0, std::min<size_t>(pos, 256)));
    filled += TrimRight(value);
    filled += TrimRight(pattern.substr(pos + 1, 256));
    out = std::move(filled);
}

void FillPercent(std::string& out, std::string_view pattern, int32_t value) {
    FillPercent(out, pattern, NumberText(static_cast<double>(value)));
}

void FillPercent(std::string& out, std::string_view pattern, float value) {
    FillPercent(out, pattern, NumberText(static_cast<double>(value)));
}

void FillPercent(std::string& out, std::string_view pattern, double value) {
    FillPercent(out, pattern, NumberText(value));
}

std::string Filled(std::string_view pattern, std::string_view value) {
    std::string out(pattern);
    FillPercent(out, pattern, value);
    return out;
}
std::string Filled(std::string_view pattern, int32_t value) {
    return Filled(pattern, NumberText(static_cast<double>(value)));
}
std::string Filled(std::string_view pattern, float value) {
    return Filled(pattern, NumberText(static_cast<double>(value)));
}
std::string Filled(std::string_view pattern, double value) {
    return Filled(pattern, NumberText(value));
}

// ---- numbers --------------------------------------------------------------

std::string FormatNumber(double x, int width) {
    const int w = (width <= 0 || width > 20) ? (width <= 0 ? 10 : 20) : width;
    const double ax = std::fabs(x);
    if (std::isnan(x)) return std::string(w > 3 ? w - 3 : 0, ' ') + std::string("NaN").substr(0, w);
    if (std::isinf(x)) {
        const std::string text = x < 0 ? "-Inf" : "Inf";
        if (static_cast<int>(text.size()) > w) return std::string(w, '*');
        return std::string(w - text.size(), ' ') + text;
    }
    const float upper = PowerOfTen(w - 1) - 1.0f;
    const float lower = 1.0f / PowerOfTen(w - 4 > 0 ? w - 4 : 0);

    if (ax <= 1e-100) return std::string(w - 1, ' ') + "0";

    std::string text;
    if (ax >= upper || ax <= lower) {
        // Exponent form: d.dddddddddd and a four-character exponent in a field of 20.
        char buf[64];
        std::snprintf(buf, sizeof buf, "%.10E", x);
        std::string field(buf);
        const size_t e = field.find('E');
        std::string exponent = field.substr(e);
        if (exponent.size() != 4) return std::string(w, '*');  // exponent beyond two digits
        std::string mantissa = StripTrailingZeros(field.substr(0, e));
        const int keep = w - 4 > 0 ? w - 4 : 0;
        text = std::string(TrimRight(mantissa.substr(0, keep))) + exponent;
    } else if (ax < 1.0) {
        // Six decimals cut, not rounded.
        char digits[16];
        std::snprintf(digits, sizeof digits, "%06d", static_cast<int>(ax * 1000000.0));
        text = std::string(x < 0 ? "-0." : "0.") + digits;
        text = StripTrailingZeros(text);
    } else {
        char buf[64];
        const int n = std::snprintf(buf, sizeof buf, "%20.6f", x);
        if (n > 20) return std::string(w, '*');
        text = StripTrailingZeros(std::string(Trim(buf)));
    }
    if (static_cast<int>(text.size()) > w) text.resize(w);
    if (!text.empty() && text.back() == '.') text.pop_back();
    return std::string(w - text.size(), ' ') + text;
}

std::string FormatNumber(float value, int width) {
    return FormatNumber(static_cast<double>(value), width);
}

std::string FormatNumber(int32_t value, int width) {
    return FormatNumber(static_cast<double>(value), width);
}

std::string NumberText(double value) {
    return std::string(Trim(FormatNumber(value, 10)));
}

// ---- report blocks --------------------------------------------------------

void WriteBlockHeading(std::string_view title) {
    title = TrimRight(title);
    if (title.empty()) {
        WriteLine(std::string(70, '='));
        return;
    }
    WriteLine("");
    const int left = title.size() < 68 ? static_cast<int>(68 - title.size()) / 2 : 0;
    std::string line(left, '=');
    line += ' ';
    line += title;
    line += ' ';
    if (line.size() < 70) line.append(70 - line.size(), '=');
    WriteLine(line);
    WriteLine("");
}

void WriteLabelled(std::string_view label, std::string_view value) {
    WriteLine("  " + Filled(label, value));
}
void WriteLabelled(std::string_view label, int32_t value) {
    WriteLine("  " + Filled(label, value));
}
void WriteLabelled(std::string_view label, float value) {
    WriteLine("  " + Filled(label, value));
}
void WriteLabelled(std::string_view label, double value) {
    WriteLine("  " + Filled(label, value));
}
