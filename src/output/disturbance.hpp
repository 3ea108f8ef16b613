// Wave disturbance: the wave height over the grid as a ratio to the height
// at the harbour mouth (a given height, or the height at a given point),
// from on-line sums like those of the wave statistics, in one map file over
// the whole grid, and a text report of the ratio for each area of a code map.
//
// With N the samples of a point and S1, S2 the sums of the surface eta and
// of eta^2 since the point started,
//   var = (S2 - S1^2 / N) / (N - 1)   (32-bit floats),
//   Hm0 = max(4 sqrt(var), 1e-4)      (1e-4 with fewer than two samples),
//   ratio = Hm0 / H,
// H being Incoming_Wave_Height (Scaling_Type 1) or the Hm0 at Grid_Point at
// the output (any other Scaling_Type). A point has a value only when it has
// been wet at every step since it started.
//
// When a point starts: Type 1 when Number_of_first_wave crests and troughs
// have passed it, counted by the change of the surface over one step divided
// by H against Eps_High and Eps_Low (while H is not known: its sign); Type 3
// at the first step after each output, the sums restarting; any other Type
// at First_Time_Step + 1 for all points.
//
// The area report, for each code above 0 of the code map that has water
// points (bed below 0): maximum, mean, minimum and standard deviation of the
// ratio over its water points, and their number. A water point without a
// ratio counts as 0.
#pragma once

#include <cstdint>
#include <vector>

#include "data/xolfile.hpp"
#include "output/output_sections.hpp"

// The three items of the map file, item n at index n - 1.
constexpr int32_t kDisturbanceItemCount = 3;
extern const OutputItemInfo kDisturbanceItemInfo[kDisturbanceItemCount];

struct DisturbanceState {
    // Per grid point, (J+1) x (K+1), x fastest like the fields.
    std::vector<int32_t> samples;    // steps summed
    std::vector<int32_t> firstStep;  // < 0: -1 less the half waves counted; else the start step
    std::vector<int32_t> risen;      // 1 while the surface rises (Type 1)
    std::vector<float> sumEta, sumEta2;
    std::vector<float> work;  // the map of one item, rebuilt at each output
    // H: Incoming_Wave_Height, or the last height found at Grid_Point; 0
    // while there is none.
    float height = 0.0f;
    bool warnedNoHeight = false;
    XolFile file;

    // The area report (Type_of_Area_Statistic above 0), made at setup.
    std::vector<int32_t> areaCode;    // per grid point: its code, 0 outside every area
    std::vector<int32_t> areaPoints;  // per code 0..largest: its water points
    std::vector<double> areaSum, areaSum2, areaMax, areaMin;  // per code, at one report
    int reportUnit = 0;  // text unit of the report; 0 when none is open
};
extern DisturbanceState gDisturbance;

// With the settings, when Type_of_Area_Statistic is above 0: opens the report
// (making its folder) and reads the code map into the area tables.
void SetupDisturbanceAreas();

// Before the first step when Output_Disturbance_2D has Type above 0: the
// per-point arrays, the map file, and the write of step 0.
void InitOutputDisturbance();
void CreateOutputDisturbance();
// After each step: the sums of step n, then the map and report due at n.
void UpdateOutputDisturbance(int32_t step);
void WriteOutputDisturbance(int32_t step);
// After the last step: the file flushed, closed and summarised, the arrays
// freed, the report closed; a second call does nothing.
void CloseOutputDisturbance();
