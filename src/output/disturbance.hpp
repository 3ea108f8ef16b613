// Wave disturbance: the wave height over the grid as a ratio to the height
// at the harbour mouth (a given height, or the height at a given point),
// from on-line sums like those of the wave statistics, in one map file,
// and a text report of the ratio for each area of a code map.
#pragma once

#include <cstdint>

#include "output/output_sections.hpp"

// Before the first step when Output_Disturbance_2D has Type above 0.
void InitOutputDisturbance();
void CreateOutputDisturbance();
// After each step: the sums of step n, then the map and report due at n.
void UpdateOutputDisturbance(int32_t step);
void WriteOutputDisturbance(int32_t step);
// After the last step: the file and the report closed.
void CloseOutputDisturbance();
