#include "bwview/render.hpp"

#include <algorithm>
#include <cstdio>
#include <vector>

namespace {

constexpr int kMinBarCells = 10;
constexpr int kMaxBarCells = 40;
constexpr int kBarFrame = 3;  // "[", "]" and the blank behind
const std::string kSeparator = "  ";
const std::string kStepPrefix = "Time step: ";

// One piece of the line; a lower rank is kept longer when space is short.
struct Piece {
    std::string text;
    int rank;
};

int Length(const std::vector<Piece>& pieces) {
    int length = 0;
    for (const Piece& piece : pieces) {
        if (length > 0) length += static_cast<int>(kSeparator.size());
        length += static_cast<int>(piece.text.size());
    }
    return length;
}

}  // namespace

double EstimateTimeLeft(const ViewState& state, double nowWall) {
    if (state.timeLeft >= 0) return static_cast<double>(state.timeLeft);
    if (state.progress < 0 || state.firstProgress < 0) return -1.0;
    if (state.progress >= 1000) return 0.0;
    const int gained = state.progress - state.firstProgress;
    const double span = state.changeWall - state.firstWall;
    if (gained <= 0 || span <= 0.0) return -1.0;
    // The time the rest takes at the rate so far, less what passed since the
    // last change, so that the estimate counts down between reports.
    const double left = (1000 - state.progress) * span / gained - (nowWall - state.changeWall);
    return left > 0.0 ? left : 0.0;
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
    const int perMille = std::clamp(state.progress, 0, 1000);
    char percent[16];
    std::snprintf(percent, sizeof percent, "%5.1f%%", perMille / 10.0);

    const bool stepMessage = state.message.rfind(kStepPrefix, 0) == 0;
    std::vector<Piece> pieces{{percent, 0}};
    if (!state.status.empty()) pieces.push_back({state.status, 4});
    if (stepMessage) pieces.push_back({"step " + state.message.substr(kStepPrefix.size()), 3});
    if (state.speed >= 0) pieces.push_back({FormatSpeed(state.speed), 5});
    if (secondsLeft >= 0.0 && perMille < 1000)
        pieces.push_back({"left " + FormatDuration(secondsLeft), 2});
    if (!stepMessage && !state.message.empty()) pieces.push_back({state.message, 6});

    if (width > 0) {
        // Room for the pieces once the smallest bar is drawn.
        int room = width - (bar ? kMinBarCells + kBarFrame : 0);
        if (room < static_cast<int>(pieces.front().text.size())) {
            bar = false;
            room = width;
        }
        while (pieces.size() > 1 && Length(pieces) > room) {
            // A message at the end is cut rather than left out while a fair part of it fits.
            Piece& last = pieces.back();
            const int over = Length(pieces) - room;
            if (last.rank == 6 && static_cast<int>(last.text.size()) - over >= 12) {
                last.text = last.text.substr(0, last.text.size() - static_cast<size_t>(over));
                break;
            }
            const auto drop =
                std::max_element(pieces.begin(), pieces.end(),
                                 [](const Piece& a, const Piece& b) { return a.rank < b.rank; });
            pieces.erase(drop);
        }
    }

    std::string rest;
    for (const Piece& piece : pieces) rest += (rest.empty() ? "" : kSeparator) + piece.text;
    std::string line;
    if (bar) {
        const int cells = width > 0 ? std::clamp(width - kBarFrame - static_cast<int>(rest.size()),
                                                 kMinBarCells, kMaxBarCells)
                                    : kMaxBarCells / 2;
        const int full = perMille * cells / 1000;
        line = "[" + std::string(full, '#') + std::string(cells - full, '-') + "] ";
    }
    line += rest;
    if (width > 0 && static_cast<int>(line.size()) > width) line.resize(width);
    return line;
}
