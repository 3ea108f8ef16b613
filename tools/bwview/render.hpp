// The viewer's one line: progress bar, percent, simulation date and time,
// time step, speed, time left and the last message, fitted to a width.
#pragma once

#include <string>

#include "bwview/follow.hpp"

// Estimates the time left from the rate at which progress grew since it was
// first seen.
struct RateTracker {
    double firstWall = -1.0;
    int firstProgress = -1;
};
// Seconds left, or a negative value while there is no rate yet.
double EstimateTimeLeft(const ViewState& state, double nowWall, RateTracker& tracker);

std::string FormatDuration(double seconds);          // "42s", "3:07", "1:02:03"
std::string FormatSpeed(long long pointsPerSecond);  // "850 pt/s", "1.25 Mpt/s"

// The line, at most width characters; with bar false no progress bar is drawn.
std::string RenderLine(const ViewState& state, double secondsLeft, int width, bool bar);
