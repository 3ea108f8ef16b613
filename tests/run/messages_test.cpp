#include "run/messages.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <tuple>

#include "support/log_capture.hpp"

namespace {

// The number form of messages: fixed where it fits, else exponent form, cut
// not rounded, asterisks where nothing fits; integers and floats alike.
TEST(FormatNumber, FixedExponentAndEdgeForms) {
    const std::tuple<double, int, const char*> cases[] = {
        {0.0, 10, "         0"},
        {1e-101, 10, "         0"},
        {3.0, 10, "         3"},
        {-0.25, 10, "     -0.25"},
        {0.1234567, 10, "  0.123456"},    // six decimals cut, not rounded
        {999999999.0, 10, " 999999999"},  // nine digits stay in the fixed form
        {1e9, 10, "    1.E+09"},          // ten digits take the exponent form
        {1.23456789e12, 10, "1.2345E+12"},
        {-1.5e-7, 10, "  -1.5E-07"},       // below 1e-6 at width 10
        {1234.5678912, 10, "1234.56789"},  // longer than the width: cut
        {1e100, 10, "**********"},         // exponent beyond two digits
        {-42.0, 5, "  -42"},
        {123456.0, 5, "1E+05"},  // one mantissa character is left at width 5
    };
    for (const auto& [value, width, text] : cases) EXPECT_EQ(FormatNumber(value, width), text);
    EXPECT_EQ(FormatNumber(int32_t{-1}, 10), "        -1");
    EXPECT_EQ(FormatNumber(int32_t{2000000000}, 10), "    2.E+09");
    EXPECT_EQ(FormatNumber(0.1f, 10), "       0.1");  // the float, not its double widening
    EXPECT_EQ(NumberText(1.0e-4), "0.0001");
}

// Only the first '%' is filled, the value and the rest trimmed; pattern and
// output may be one string; without a '%' the output keeps what it held.
TEST(FillPercent, FillsTheFirstPercentOnly) {
    std::string out = "kept";
    FillPercent(out, "no percent here", 3);
    EXPECT_EQ(out, "kept");
    FillPercent(out, "near (%,%)   ", 12);
    EXPECT_EQ(out, "near (12,%)");
    FillPercent(out, out, 7.5);
    EXPECT_EQ(out, "near (12,7.5)");
    EXPECT_EQ(Filled("  x = %  ", "abc   "), "  x = abc");
    EXPECT_EQ(Filled("dt %", 0.05f), "dt 0.05");
}

// Warnings in pieces of 61 characters (one full piece gets an empty second
// one), each message and heading behind an empty line, headings 70 wide.
TEST(MessageForms, WarningPiecesAndBlockHeadings) {
    bwtest::LogCapture log;
    std::string text;
    for (int i = 0; i < 130; ++i) text += static_cast<char>('a' + i % 26);
    ReportWarning(std::string(61, 'a'));
    ReportWarning("short");
    ReportWarning(text + "    ");
    WriteBlockHeading("Timings");
    WriteBlockHeading("");
    WriteLabelled("Number of threads: %", 2);
    const std::string pad(9, ' ');
    EXPECT_EQ(log.Lines(),
              (std::vector<std::string>{"", "Warning: " + std::string(61, 'a'), "", "",
                                        "Warning: short", "", "Warning: " + text.substr(0, 61),
                                        pad + text.substr(61, 61), pad + text.substr(122), "",
                                        std::string(30, '=') + " Timings " + std::string(31, '='),
                                        "", std::string(70, '='), "  Number of threads: 2"}));
}

// Gives the message layer a log at path (in the child of a death test).
void LogTo(const std::string& path) {
    const int unit = GetFreeUnit();
    OpenUnit(unit, path, "w");
    SetLogUnit(unit);
}

// The orderly stop: the text to the log, to standard error only for the
// viewer and never in a night build, the closing words, the exit code given
// (1 when none is).
TEST(OrderlyStopDeathTest, StopRunWritesTheTextWhereItBelongs) {
    const std::tuple<bool, bool, const char*, int, const char*, const char*> cases[] = {
        {false, false, "KVT section: Sponge not found", 1, "", "Abnormal completion"},
        {false, false, "blown up", -1, "", "Abnormal completion"},
        {false, false, "cleanly", 0, "", "Successful completion"},
        {true, false, "Illegal storage access", 1, "Illegal storage access", "Abnormal completion"},
        {true, true, "only in the log", 1, "^$", "Abnormal completion"},
    };
    for (const auto& [hud, night, text, code, err, closing] : cases) {
        bwtest::TempDir dir;
        auto stop = [&] {
            hud ? setenv("TRF", "HUD", 1) : unsetenv("TRF");
            night ? setenv("BUILDMODE", "NIGHT", 1) : unsetenv("BUILDMODE");
            LogTo(dir / "stop.log");
            code == 1 ? StopRun(text) : StopRun(text, code);
        };
        EXPECT_EXIT(stop(), testing::ExitedWithCode(code & 255), err) << text;
        EXPECT_EQ(bwtest::ReadLines(dir / "stop.log"), (std::vector<std::string>{text, closing}));
    }
}

void MarkCleanup() {
    std::fputs("cleanup ran\n", stderr);
}

// A fatal error comes in pieces of 57 characters before the closing words;
// a cleanup registered twice runs once when the run ends.
TEST(OrderlyStopDeathTest, FatalFormAndExitCleanups) {
    bwtest::TempDir dir;
    auto fatal = [&] {
        LogTo(dir / "fatal.log");
        ReportFatal(std::string(60, 'x'));
    };
    EXPECT_EXIT(fatal(), testing::ExitedWithCode(1), "");
    EXPECT_EQ(bwtest::ReadLines(dir / "fatal.log"),
              (std::vector<std::string>{"", "Fatal error: " + std::string(57, 'x'),
                                        std::string(13, ' ') + "xxx", "Abnormal completion"}));
    auto stop = [] {
        AddExitCleanup(MarkCleanup);
        AddExitCleanup(MarkCleanup);
        NormalExit(0);
    };
    EXPECT_EXIT(stop(), testing::ExitedWithCode(0), "^cleanup ran\n$");
}

}  // namespace
