// Wave statistics: on-line sums of the surface, its rate and the fluxes at
// every grid point while the 2DH run goes on, written at set intervals as
// maps of wave height, extremes, means and higher moments. Nothing of the
// time series is stored: one pass, a fixed number of arrays.
//
// With N the samples of a point, eta the surface, r = (eta - eta one step
// back) / dt its rate, the items are
//   Hm0 = 4 sqrt(var eta), var from (S2 - S1^2 / N) / (N - 1) in 32 bits,
//   extremes of eta (starting from 0), means S / N of eta, P, Q, U, V and
//   the roller thickness, skewness and kurtosis of eta and the skewness of
//   r (the atiltness) from the raw moments m_i = S_i / N.
// Velocities are U = (P - cx d) / (depth - d), V = (Q - cy d) / (depth - d),
// d the roller thickness (0 without rollers).
//
// When a point starts: Type 1 when Number_of_First_Wave crests and troughs
// have passed it (a counter of half waves, the surface change between
// Eps_Low and Eps_High being no change); Type 3 at the first step after each
// output (the sums restart); any other Type at First_Time_step + 1 for all.
// A dry point takes no sample; with Type_of_mean_calculation other than 2 a
// point that missed a sample since its start has no value.
#pragma once

#include <cstdint>
#include <vector>

#include "output/output_sections.hpp"

// The 17 items of the statistics output, item n at index n - 1.
constexpr int32_t kStatisticItemCount = 17;
extern const OutputItemInfo kStatisticItems[kStatisticItemCount];

// The sums of every grid point, (J+1) x (K+1) each, x fastest like the fields.
struct StatisticState {
    std::vector<int32_t> samples;    // steps summed
    std::vector<int32_t> firstStep;  // < 0: -1 less the half waves counted; else the start step
    std::vector<int32_t> risen;      // 1 while the surface rises (Type 1)
    std::vector<float> etaMax, etaMin;
    std::vector<float> sumEta, sumEta2, sumEta3, sumEta4;
    std::vector<float> sumRate, sumRate2, sumRate3;
    std::vector<float> sumP, sumQ, sumU, sumV, sumDelta;
    // The height the surface change of the first-wave test is divided by:
    // Incoming_Wave_Height of the disturbance output when it is given, else
    // 1 m, so that Eps_High and Eps_Low are changes of the surface in metres
    // over one step.
    float waveScale = 1.0f;
};
extern StatisticState gStatistics;

// Before the first step when Output_Statistic_2D has Type above 0: the
// arrays, the files, and the write of step 0.
void InitOutputStatistic();
void CreateOutputStatistic();
// After each step when the section also has records: the sums of step n,
// then the maps due at n.
void UpdateOutputStatistic(int32_t step);
void WriteOutputStatistic(int32_t step);
// After the last step: flush, close and summarise the files, free the sums;
// a second call does nothing.
void CloseOutputStatistic();
