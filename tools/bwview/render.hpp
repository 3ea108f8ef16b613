// The viewer's one line: progress bar, percent, simulation date and time,
// time step, speed, time left and the last message, fitted to a width.
#pragma once

#include <string>

#include "bwview/follow.hpp"

// Seconds left, from the rate at which the progress grew since the viewer
// first saw it; negative while there is no rate yet.
double EstimateTimeLeft(const ViewState& state, double nowWall);

std::string FormatDuration(double seconds);          // "42s", "3:07", "1:02:03"
std::string FormatSpeed(long long pointsPerSecond);  // "850 pt/s", "12.5 kpt/s", "1.25 Mpt/s"

// The line in at most width characters (no limit for width 0). What does not
// fit is left out, least needed first: the message, the speed, the date, the
// step, the time left; the bar shrinks to 10 cells before it goes. With bar
// false no bar is drawn.
std::string RenderLine(const ViewState& state, double secondsLeft, int width, bool bar);
