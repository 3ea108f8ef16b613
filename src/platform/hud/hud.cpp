#include "platform/hud/hud.hpp"

#include <cstdio>
#include <cstdlib>

void hudMessage(const char* text, const char* title, int /*style*/) {
    if (title != nullptr && title[0] != '\0')
        std::fprintf(stderr, "%s: %s\n", title, text);
    else
        std::fprintf(stderr, "%s\n", text);
    std::fflush(stderr);
}

void hudExit(int code) {
    std::fflush(nullptr);
    // _Exit: no destructors of static objects run, so a stop from a signal
    // handler or from deep inside a solver ends at once and in one way.
    std::_Exit(code);
}
