#include "run/signals.hpp"

#include <gtest/gtest.h>

#include <cfenv>
#include <csignal>
#include <cstdlib>
#include <tuple>

#include "run/fpmode.hpp"

namespace {

volatile double gSmall = 1e-300;
volatile double gZero = 0.0;

// Each signal ends the run with code 1 and its own text; a trapped division
// by zero ends it with code 8; an underflow that traps is let through and
// flushed to zero. Denormals become zero in the engine's floating-point mode.
TEST(SignalDeathTest, EachSignalEndsTheRunWithItsTextButAnUnderflow) {
    const std::tuple<int, int, const char*, int> cases[] = {
        {SIGTERM, 0, "Termination request", 1},
        {SIGINT, 0, "Control-C send", 1},
        {SIGSEGV, 0, "Illegal storage access", 1},
        {SIGILL, 0, "Illegal instruction", 1},
        {SIGABRT, 0, "Abnormal termination", 1},
        {0, FE_DIVBYZERO, "Floating point exception: Zero divide", 8},
        {0, FE_UNDERFLOW, "^$", 0}};
    for (const auto& [sig, trap, text, code] : cases) {
        auto run = [&] {
            setenv("TRF", "HUD", 1);  // the text goes to standard error, where the test sees it
            unsetenv("BUILDMODE");
            InstallSignalHandlers();
            SetFloatingPointMode();
            if (sig != 0) std::raise(sig);
            feenableexcept(trap);
            volatile double x = trap == FE_UNDERFLOW ? gSmall * gSmall : 1.0 / gZero;
            std::exit(x == 0.0 ? 0 : 3);
        };
        EXPECT_EXIT(run(), testing::ExitedWithCode(code), text) << text;
    }
    SetFloatingPointMode();
    volatile float tiny = 1e-30f;
    volatile float product = tiny * 1e-10f;  // 1e-40 is a denormal float
    EXPECT_EQ(product, 0.0f);
}

}  // namespace
