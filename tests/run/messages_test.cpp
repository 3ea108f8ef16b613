#include "run/messages.hpp"

#include <gtest/gtest.h>

#include <cstdlib>

#include "support/log_capture.hpp"

using bwtest::LogCapture;

namespace {

struct NumberCase {
    double value;
    int width;
    const char* text;
};

TEST(FormatNumber, FixedExponentAndEdgeForms) {
    const NumberCase cases[] = {
        {0.0, 10, "         0"},
        {1e-101, 10, "         0"},
        {3.0, 10, "         3"},
        {12.5, 10, "      12.5"},
        {-0.25, 10, "     -0.25"},
        {0.5, 10, "       0.5"},
        {0.1234567, 10, "  0.123456"},    // six decimals cut, not rounded
        {999999999.0, 10, " 999999999"},  // nine digits stay in the fixed form
        {1e9, 10, "    1.E+09"},          // ten digits take the exponent form
        {1.23456789e12, 10, "1.2345E+12"},
        {-1.5e-7, 10, "  -1.5E-07"},  // below 1e-6 at width 10
        {1e-7, 10, "    1.E-07"},
        {1234.5678912, 10, "1234.56789"},  // longer than the width: cut
        {1e100, 10, "**********"},         // exponent beyond two digits
        {-42.0, 5, "  -42"},
        {123456.0, 5, "1E+05"},  // one mantissa character is left at width 5
    };
    for (const auto& c : cases) EXPECT_EQ(FormatNumber(c.value, c.width), c.text) << c.value;
}

TEST(FormatNumber, IntegersAndFloatsGoThroughTheSameForm) {
    EXPECT_EQ(FormatNumber(int32_t{-1}, 10), "        -1");
    EXPECT_EQ(FormatNumber(int32_t{2000000000}, 10), "    2.E+09");
    EXPECT_EQ(FormatNumber(0.1f, 10), "       0.1");
    EXPECT_EQ(NumberText(1.0e-4), "0.0001");
}

TEST(FillPercent, FillsTheFirstPercentOnly) {
    std::string out = "kept";
    FillPercent(out, "no percent here", 3);
    EXPECT_EQ(out, "kept");  // without a '%' the output keeps its content

    FillPercent(out, "near (%,%)   ", 12);
    EXPECT_EQ(out, "near (12,%)");
    FillPercent(out, out, 7.5);
    EXPECT_EQ(out, "near (12,7.5)");

    EXPECT_EQ(Filled("  x = %  ", "abc   "), "  x = abc");
    EXPECT_EQ(Filled("dt %", 0.05f), "dt 0.05");
    EXPECT_EQ(Filled("%", "value"), "value");
}

TEST(MessageForms, WarningPiecesAndBlockHeadings) {
    LogCapture log;
    ReportWarning(std::string(61, 'a'));  // exactly one piece: a second, empty line follows
    ReportWarning("short");
    WriteBlockHeading("Timings");
    WriteBlockHeading("");
    WriteLabelled("Number of threads: %", 2);
    auto lines = log.Lines();
    ASSERT_EQ(lines.size(), 10u);
    EXPECT_EQ(lines[0], "");
    EXPECT_EQ(lines[1], "Warning: " + std::string(61, 'a'));
    EXPECT_EQ(lines[2], "");
    EXPECT_EQ(lines[4], "Warning: short");
    EXPECT_EQ(lines[5], "");
    EXPECT_EQ(lines[6], std::string(30, '=') + " Timings " + std::string(31, '='));
    EXPECT_EQ(lines[6].size(), 70u);
    EXPECT_EQ(lines[7], "");
    EXPECT_EQ(lines[8], std::string(70, '='));
    EXPECT_EQ(lines[9], "  Number of threads: 2");
}

TEST(MessageForms, LongWarningWrapsAtSixtyOneCharacters) {
    LogCapture log;
    std::string text;
    for (int i = 0; i < 130; ++i) text += static_cast<char>('a' + i % 26);
    ReportWarning(text + "    ");
    auto lines = log.Lines();
    ASSERT_EQ(lines.size(), 4u);
    EXPECT_EQ(lines[1], "Warning: " + text.substr(0, 61));
    EXPECT_EQ(lines[2], "         " + text.substr(61, 61));
    EXPECT_EQ(lines[3], "         " + text.substr(122));
}

// ---- the ways a run ends ----------------------------------------------------

TEST(OrderlyStopDeathTest, StopRunWritesTheTextAndTheClosingWords) {
    bwtest::TempDir dir;
    const std::string path = dir / "stop.log";
    auto stop = [&] {
        unsetenv("BUILDMODE");
        unsetenv("TRF");
        const int unit = GetFreeUnit();
        OpenUnit(unit, path, "w");
        SetLogUnit(unit);
        StopRun("KVT section: Sponge not found");
    };
    EXPECT_EXIT(stop(), testing::ExitedWithCode(1), "");
    auto lines = bwtest::ReadLines(path);
    ASSERT_EQ(lines.size(), 2u);
    EXPECT_EQ(lines[0], "KVT section: Sponge not found");
    EXPECT_EQ(lines[1], "Abnormal completion");

    EXPECT_EXIT(StopRun("blown up", -1), testing::ExitedWithCode(255), "");
    EXPECT_EXIT(StopRun("cleanly", 0), testing::ExitedWithCode(0), "");
}

TEST(OrderlyStopDeathTest, MessageGoesToTheViewerOrNowhere) {
    auto hud = [] {
        setenv("TRF", "HUD", 1);
        unsetenv("BUILDMODE");
        StopRun("Illegal storage access");
    };
    EXPECT_EXIT(hud(), testing::ExitedWithCode(1), "Illegal storage access");

    bwtest::TempDir dir;
    const std::string path = dir / "night.log";
    auto night = [&] {
        setenv("BUILDMODE", "NIGHT", 1);
        setenv("TRF", "HUD", 1);
        const int unit = GetFreeUnit();
        OpenUnit(unit, path, "w");
        SetLogUnit(unit);
        StopRun("only in the log");
    };
    // Nothing on standard error; the text still reaches the log.
    EXPECT_EXIT(night(), testing::ExitedWithCode(1), "^$");
    EXPECT_NE(bwtest::ReadFile(path).find("only in the log"), std::string::npos);
}

TEST(OrderlyStopDeathTest, ReportFatalUsesTheFatalForm) {
    bwtest::TempDir dir;
    const std::string path = dir / "fatal.log";
    auto fatal = [&] {
        const int unit = GetFreeUnit();
        OpenUnit(unit, path, "w");
        SetLogUnit(unit);
        ReportFatal(std::string(60, 'x'));
    };
    EXPECT_EXIT(fatal(), testing::ExitedWithCode(1), "");
    auto lines = bwtest::ReadLines(path);
    ASSERT_EQ(lines.size(), 4u);
    EXPECT_EQ(lines[1], "Fatal error: " + std::string(57, 'x'));
    EXPECT_EQ(lines[2], std::string(13, ' ') + "xxx");
    EXPECT_EQ(lines[3], "Abnormal completion");
}

void MarkCleanup() {
    std::fputs("cleanup ran\n", stderr);
}

TEST(OrderlyStopDeathTest, ExitCleanupsRunOnEveryStop) {
    auto stop = [] {
        AddExitCleanup(MarkCleanup);
        AddExitCleanup(MarkCleanup);  // registered once
        NormalExit(0);
    };
    EXPECT_EXIT(stop(), testing::ExitedWithCode(0), "^cleanup ran\n$");
}

}  // namespace
