#include "run/signals.hpp"

#include <gtest/gtest.h>

#include <cfenv>
#include <csignal>
#include <cstdio>
#include <tuple>

#include "run/fpmode.hpp"
#include "run/messages.hpp"

namespace {

// A SIGFPE's si_code maps to the sub-code of the stop text (none for underflow).
TEST(FloatingPointSignals, SubCodesAndTexts) {
    const std::pair<int, int> codes[] = {{FPE_FLTINV, kFpeInvalid},  {FPE_FLTDIV, kFpeZeroDivide},
                                         {FPE_FLTOVF, kFpeOverflow}, {FPE_FLTUND, kFpeUnderflow},
                                         {FPE_FLTRES, kFpeInexact},  {FPE_INTDIV, kFpeNonIeee}};
    for (const auto& [siCode, subCode] : codes) EXPECT_EQ(FpeSubCode(siCode), subCode) << siCode;
    EXPECT_EQ(FpeText(kFpeUnderflow), "");
}

volatile double gSmall = 1e-300;
volatile double gZero = 0.0;

// Each signal ends the run with code 1 and its own text; a trapped division
// by zero ends it with code 8.
TEST(SignalDeathTest, EachSignalEndsTheRunWithItsText) {
    const std::tuple<int, const char*, int> cases[] = {
        {SIGTERM, "Termination request", 1},    {SIGINT, "Control-C send", 1},
        {SIGSEGV, "Illegal storage access", 1}, {SIGILL, "Illegal instruction", 1},
        {SIGABRT, "Abnormal termination", 1},   {0, "Floating point exception: Zero divide", 8}};
    for (const auto& [sig, text, code] : cases) {
        auto run = [&] {
            setenv("TRF", "HUD", 1);  // the text goes to standard error, where the test sees it
            unsetenv("BUILDMODE");
            InstallSignalHandlers();
            if (sig != 0) std::raise(sig);
            feenableexcept(FE_DIVBYZERO);
            volatile double x = 1.0 / gZero;
            (void)x;
        };
        EXPECT_EXIT(run(), testing::ExitedWithCode(code), text) << sig;
    }
}

// An underflow that traps is let through and flushed to zero; denormals
// become zero in the engine's floating-point mode.
TEST(SignalDeathTest, UnderflowNeverEndsARunAndDenormalsBecomeZero) {
    auto run = [] {
        setenv("TRF", "HUD", 1);
        InstallSignalHandlers();
        SetFloatingPointMode();
        feenableexcept(FE_UNDERFLOW);
        volatile double x = gSmall * gSmall;
        std::fprintf(stderr, "result %g\n", x);
        std::exit(x == 0.0 ? 0 : 3);
    };
    EXPECT_EXIT(run(), testing::ExitedWithCode(0), "result 0");
    SetFloatingPointMode();
    EXPECT_TRUE(FlushToZeroActive());
    volatile float tiny = 1e-30f;
    volatile float product = tiny * 1e-10f;  // 1e-40 is a denormal float
    EXPECT_EQ(product, 0.0f);
}

}  // namespace
