#include "bwview/render.hpp"

#include <cstdio>

double EstimateTimeLeft(const ViewState& state, double nowWall, RateTracker& tracker) {
    if (state.timeLeft >= 0) return static_cast<double>(state.timeLeft);
    if (state.progress < 0) return -1.0;
    if (tracker.firstProgress < 0 || state.progress < tracker.firstProgress) {
        tracker.firstProgress = state.progress;
        tracker.firstWall = nowWall;
        return -1.0;
    }
    const int gained = state.progress - tracker.firstProgress;
    const double elapsed = nowWall - tracker.firstWall;
    if (gained <= 0 || elapsed <= 0.0) return -1.0;
    return (1000 - state.progress) * elapsed / gained;
}

std::string FormatDuration(double seconds) {
    const long s = static_cast<long>(seconds + 0.5);
    char text[32];
    if (s < 60)
        std::snprintf(text, sizeof text, "%lds", s);
    else if (s < 3600)
        std::snprintf(text, sizeof text, "%ld:%02ld", s / 60, s % 60);
    else
        std::snprintf(text, sizeof text, "%ld:%02ld:%02ld", s / 3600, (s / 60) % 60, s % 60);
    return text;
}

std::string FormatSpeed(long long pointsPerSecond) {
    char text[32];
    const double v = static_cast<double>(pointsPerSecond);
    if (pointsPerSecond < 10000)
        std::snprintf(text, sizeof text, "%lld pt/s", pointsPerSecond);
    else if (pointsPerSecond < 1000000)
        std::snprintf(text, sizeof text, "%.1f kpt/s", v / 1e3);
    else
        std::snprintf(text, sizeof text, "%.2f Mpt/s", v / 1e6);
    return text;
}

std::string RenderLine(const ViewState& state, double secondsLeft, int width, bool bar) {
    const int perMille = state.progress < 0 ? 0 : (state.progress > 1000 ? 1000 : state.progress);
    char percent[16];
    std::snprintf(percent, sizeof percent, "%5.1f%%", perMille / 10.0);

    std::string rest = std::string(percent);
    if (!state.status.empty()) rest += "  " + state.status;
    const std::string stepPrefix = "Time step: ";
    const bool stepMessage = state.message.rfind(stepPrefix, 0) == 0;
    if (stepMessage) rest += "  step " + state.message.substr(stepPrefix.size());
    if (state.speed >= 0) rest += "  " + FormatSpeed(state.speed);
    if (secondsLeft >= 0.0) rest += "  left " + FormatDuration(secondsLeft);
    if (!stepMessage && !state.message.empty()) rest += "  " + state.message;

    std::string line;
    if (bar) {
        int cells = width - static_cast<int>(rest.size()) - 3;
        if (cells > 30) cells = 30;
        if (cells < 10) cells = 10;
        const int full = perMille * cells / 1000;
        line = "[" + std::string(full, '#') + std::string(cells - full, '-') + "] ";
    }
    line += rest;
    if (width > 0 && static_cast<int>(line.size()) > width) line.resize(width);
    return line;
}
