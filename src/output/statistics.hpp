// Wave statistics: on-line sums of the surface, its rate and the fluxes at
// every grid point while the 2DH run goes on, written at set intervals as
// maps of wave height, extremes, means and higher moments. Nothing of the
// time series is stored: one pass, a fixed number of arrays.
#pragma once

#include <cstdint>

#include "output/output_sections.hpp"

// Before the first step when Output_Statistic_2D has Type above 0: the
// arrays, the files, and the write of step 0.
void InitOutputStatistic();
void CreateOutputStatistic();
// After each step when the section also has records: the sums of step n,
// then the maps due at n.
void UpdateOutputStatistic(int32_t step);
void WriteOutputStatistic(int32_t step);
// After the last step: flush, close and summarise the files.
void CloseOutputStatistic();
