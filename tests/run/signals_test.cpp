#include "run/signals.hpp"

#include <gtest/gtest.h>

#include <cfenv>
#include <csignal>
#include <cstdio>

#include "run/fpmode.hpp"
#include "run/messages.hpp"

namespace {

TEST(FloatingPointSignals, SubCodesAndTexts) {
    EXPECT_EQ(FpeSubCode(FPE_FLTINV), kFpeInvalid);
    EXPECT_EQ(FpeSubCode(FPE_FLTDIV), kFpeZeroDivide);
    EXPECT_EQ(FpeSubCode(FPE_FLTOVF), kFpeOverflow);
    EXPECT_EQ(FpeSubCode(FPE_FLTUND), kFpeUnderflow);
    EXPECT_EQ(FpeSubCode(FPE_FLTRES), kFpeInexact);
    EXPECT_EQ(FpeSubCode(FPE_INTDIV), kFpeNonIeee);
    EXPECT_EQ(FpeText(kFpeZeroDivide), "Floating point exception: Zero divide");
    EXPECT_EQ(FpeText(kFpeDenormal), "Floating point exception: Denormalized number");
    EXPECT_EQ(FpeText(kFpeNonIeee), "Floating point exception: Non-IEEE type");
    EXPECT_EQ(FpeText(kFpeUnderflow), "");
}

volatile double gSmall = 1e-300;
volatile double gZero = 0.0;

TEST(SignalDeathTest, EachSignalEndsTheRunWithItsText) {
    const struct {
        int signal;
        const char* text;
    } cases[] = {{SIGTERM, "Termination request"},
                 {SIGINT, "Control-C send"},
                 {SIGSEGV, "Illegal storage access"},
                 {SIGILL, "Illegal instruction"},
                 {SIGABRT, "Abnormal termination"}};
    for (const auto& c : cases) {
        auto run = [&] {
            setenv("TRF", "HUD", 1);  // the text goes to standard error, where the test sees it
            unsetenv("BUILDMODE");
            InstallSignalHandlers();
            std::raise(c.signal);
        };
        EXPECT_EXIT(run(), testing::ExitedWithCode(1), c.text) << c.signal;
    }
}

TEST(SignalDeathTest, TrappedDivisionByZeroStopsWithCodeEight) {
    auto run = [] {
        setenv("TRF", "HUD", 1);
        InstallSignalHandlers();
        feenableexcept(FE_DIVBYZERO);
        volatile double x = 1.0 / gZero;
        (void)x;
    };
    EXPECT_EXIT(run(), testing::ExitedWithCode(8), "Floating point exception: Zero divide");
}

TEST(SignalDeathTest, UnderflowNeverEndsARun) {
    auto run = [] {
        setenv("TRF", "HUD", 1);
        InstallSignalHandlers();
        SetFloatingPointMode();
        feenableexcept(FE_UNDERFLOW);
        volatile double x = gSmall * gSmall;  // traps, is let through, flushes to zero
        std::fprintf(stderr, "result %g\n", x);
        std::exit(x == 0.0 ? 0 : 3);
    };
    EXPECT_EXIT(run(), testing::ExitedWithCode(0), "result 0");
}

TEST(FloatingPointMode, DenormalsBecomeZero) {
    SetFloatingPointMode();
    EXPECT_TRUE(FlushToZeroActive());
    volatile float tiny = 1e-30f;
    volatile float product = tiny * 1e-10f;  // 1e-40 is a denormal float
    EXPECT_EQ(product, 0.0f);
}

}  // namespace
