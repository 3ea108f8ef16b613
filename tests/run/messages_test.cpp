#include "run/messages.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <tuple>

#include "support/log_capture.hpp"

namespace {

// The number form of messages: fixed where it fits, else exponent form, cut
// not rounded, asterisks where nothing fits.
TEST(MessageForms, NumbersAndPercentPatterns) {
    const std::tuple<double, int, const char*> cases[] = {
        {1e-101, 10, "         0"},
        {-0.1234567, 10, " -0.123456"},    // six decimals cut, not rounded
        {999999999.0, 10, " 999999999"},   // nine digits stay in the fixed form
        {1e9, 10, "    1.E+09"},           // ten digits take the exponent form
        {-1.5e-7, 10, "  -1.5E-07"},       // below 1e-6 at width 10
        {1234.5678912, 10, "1234.56789"},  // longer than the width: cut
        {1e100, 10, "**********"},         // exponent beyond two digits
        {123456.0, 5, "1E+05"},            // one mantissa character is left at width 5
    };
    for (const auto& [value, width, text] : cases) EXPECT_EQ(FormatNumber(value, width), text);
    // '%' filled with the value and the rest trimmed; without one the output keeps what it held.
    std::string out = "kept";
    FillPercent(out, "no percent here", 3);
    EXPECT_EQ(out, "kept");
    EXPECT_EQ(Filled("  x = %  ", "abc   "), "  x = abc");
}

// Warnings in pieces of 61 characters (one full piece gets an empty second
// one), each behind an empty line.
TEST(MessageForms, WarningPieces) {
    bwtest::LogCapture log;
    std::string text;
    for (int i = 0; i < 130; ++i) text += static_cast<char>('a' + i % 26);
    ReportWarning(std::string(61, 'a'));
    ReportWarning(text + "    ");
    const std::string pad(9, ' ');
    EXPECT_EQ(log.Lines(),
              (std::vector<std::string>{"", "Warning: " + std::string(61, 'a'), "", "",
                                        "Warning: " + text.substr(0, 61), pad + text.substr(61, 61),
                                        pad + text.substr(122)}));
}

// A warning the user must see: in the log, and on the screen too but not in a
// night build; without a log it is on the screen once, as any warning.
TEST(MessageForms, UserWarningsOnTheScreenToo) {
    const char* mode = std::getenv("BUILDMODE");
    const std::string saved = mode != nullptr ? mode : "";
    std::string screens;
    for (const char* buildMode : {"", "NIGHT"}) {
        setenv("BUILDMODE", buildMode, 1);
        bwtest::LogCapture log;
        testing::internal::CaptureStdout();
        ReportUserWarning("look  ");
        screens += testing::internal::GetCapturedStdout() + "|";
        EXPECT_EQ(log.Lines(), (std::vector<std::string>{"", "Warning: look"}));
    }
    testing::internal::CaptureStdout();
    ReportUserWarning("alone");
    setenv("BUILDMODE", saved.c_str(), 1);
    EXPECT_EQ(screens + testing::internal::GetCapturedStdout(),
              "Warning: look\n||\nWarning: alone\n");
}

// Gives the message layer a log at path (in the child of a death test).
void LogTo(const std::string& path) {
    const int unit = GetFreeUnit();
    OpenUnit(unit, path, "w");
    SetLogUnit(unit);
}

void MarkCleanup() {
    std::fputs("cleanup ran\n", stderr);
}

// The orderly stop: the text and the closing words to the log, the text to
// standard error for the viewer but never in a night build, the exit code
// given; a fatal error in pieces of 57 characters. A cleanup registered twice
// runs once.
TEST(OrderlyStopDeathTest, TextsWhereTheyBelongAndTheCleanupOnce) {
    using Lines = std::vector<std::string>;
    const std::string fatal = "Fatal error: " + std::string(57, 'x');
    const std::tuple<const char*, std::string, int, const char*, Lines> cases[] = {
        {"", "to the viewer", 1, "to the viewer\ncleanup ran\n$", {"to the viewer"}},
        {"NIGHT", "only in the log", -1, "^cleanup ran\n$", {"only in the log"}},
        {"NIGHT", "", 1, "^cleanup ran\n$", {"", fatal, std::string(13, ' ') + "xxx"}}};
    for (const auto& [buildMode, text, code, err, lines] : cases) {
        bwtest::TempDir dir;
        auto stop = [&] {
            setenv("TRF", "HUD", 1);
            setenv("BUILDMODE", buildMode, 1);
            LogTo(dir / "stop.log");
            AddExitCleanup(MarkCleanup);
            AddExitCleanup(MarkCleanup);
            text.empty() ? ReportFatal(std::string(60, 'x')) : StopRun(text, code);
        };
        EXPECT_EXIT(stop(), testing::ExitedWithCode(code & 255), err) << text;
        Lines log = lines;
        log.push_back("Abnormal completion");
        EXPECT_EQ(bwtest::ReadLines(dir / "stop.log"), log);
    }
}

}  // namespace
