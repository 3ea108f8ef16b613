// On-line wave statistics of the mesh solver, on the nodes of the elevation
// mesh: running sums of the surface eta, its rate r, the flux P, the
// velocity U and the radiation stress Sxx = P^2 / h + g eta^2 / 2, from
// which the statistics of a step are computed without storing the series.
// A node starts summing at its first wave (type 1), with the span
// (type 2), or anew each interval (type 3); it counts only while wet.
//
// Beside the sums a second-order Butterworth low-pass filter (bilinear
// transform, period T) follows eta, P and the second flux at every node and
// every call: with w = dt 2 pi / T and D = w^2 + 2 sqrt(2) w + 4,
//     y = b0 (x_n + x_{n-2}) + b1 x_{n-1} + a1 y_{n-1} + a2 y_{n-2},
//     b0 = w^2 / D, b1 = 2 w^2 / D, a1 = 2 (4 - w^2) / D,
//     a2 = ((2 sqrt(2) - w) w - 4) / D.
#pragma once

#include <cstdint>
#include <vector>

#include "meshsolver/bw_model.hpp"

// The filter state of one signal at every node (1-based).
struct LowPassStateBW {
    std::vector<double> x1, x2, y1, y2, y;
};

struct WaveStatisticBW {
    // WAVE_STATISTIC.
    int32_t type = 1;  // 0 or less: off
    int32_t meanCalculation = 1;
    int32_t first_time_step = 0, last_time_step = 0, time_step_frequency = 0;
    int32_t firstWaves = 1;
    double highLimit = 1.0e-4, lowLimit = -1.0e-4;
    double filterPeriod = 80.0;

    int32_t nodes = 0;
    std::vector<int32_t> samples, firstStep, risen;
    std::vector<double> etaMax, etaMin, sumEta, sumEta2, sumEta3, sumEta4;
    std::vector<double> sumRate, sumRate2, sumRate3;
    std::vector<double> sumP, sumQ, sumU, sumV, sumDelta, sumSxx, sumSxy, sumSyy;
    LowPassStateBW filterP, filterQ, filterEta;
};
extern WaveStatisticBW gWaveStatisticBW;

void ResetWaveStatisticBW();
// Reads WAVE_STATISTIC of the open OUTPUT section and sizes the arrays on
// the elevation mesh.
void SetupWaveStatisticBW(BwModel& model);
// The sums of step n for first_time_step < n <= last_time_step, and the
// low-pass filter at every call. Vectors are 1-based on the n nodes; q, cx,
// cy may be empty where the run has no second dimension, delta and cx where
// it has no rollers.
void UpdateWaveStatisticBW(int32_t step, double timeStep, int32_t dimensions, int32_t nodes,
                           const std::vector<double>& stillDepth, const std::vector<double>& eta,
                           const std::vector<double>& etaRate, const std::vector<double>& h,
                           const std::vector<double>& p, const std::vector<double>& q,
                           int32_t rollerType, const std::vector<double>& delta,
                           const std::vector<double>& cx, const std::vector<double>& cy);
// Item `item` of the statistics at step n into work (1-based): -1.0e-30
// where a node has no value.
void CalcPhaseAverageBW(int32_t step, int32_t item, std::vector<double>& work);
