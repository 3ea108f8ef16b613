// Floating-point mode of the run: results that would be denormal become zero
// (flush-to-zero and denormals-are-zero), so that a simulation never slows
// down on fading waves. Rounding and exception masks stay as they are.
#pragma once

// Sets the mode on the calling thread; threads started later inherit it.
void SetFloatingPointMode();
// True when flush-to-zero and denormals-are-zero are on for the calling thread.
bool FlushToZeroActive();
