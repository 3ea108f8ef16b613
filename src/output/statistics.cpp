#include "output/statistics.hpp"

#include <algorithm>
#include <cmath>
#include <new>

#include "output/deterministic.hpp"
#include "output/output_lock.hpp"
#include "processes/rollers.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

StatisticState gStatistics;

const OutputItemInfo kStatisticItems[kStatisticItemCount] = {
    {"Significant wave height", 100097, 1000, "sea_surface_wave_significant_height"},
    {"Max. wave height", 100078, 1000, "sea_surface_wave_maximum_height"},
    {"Max. elevation", 100078, 1000},
    {"Min. elevation", 100078, 1000},
    {"Mean elevation", 100078, 1000},
    {"Mean flux, P", 100080, 4700},
    {"Mean flux, Q", 100080, 4700},
    {"Mean velocity, U0", 100016, 2000},
    {"Mean velocity, V0", 100016, 2000},
    {"Mean roller thickness", 100299, 1000},
    {"Skewness", 100294, 99000},
    {"Kurtosis", 100297, 99000},
    {"Atiltness", 100296, 99000},
    {"Time of first wave", 100107, 1400},
    {"Filt. elevation", 100078, 1000},
    {"Filt. flux, P", 100016, 2000},
    {"Filt. flux, Q", 100016, 2000}};

namespace {

bool RollersOn() {
    return gRollers.type == 1 && !gRollers.delta.empty();
}

// Type 1: counts the half waves passing each point that has not started,
// and starts it at step n when Number_of_First_Wave crests and troughs have
// passed.
void DetectFirstWave(int32_t n) {
    const GridState& g = gGrid;
    StatisticState& s = gStatistics;
    const StatisticSettings& set = gStatisticOutput;
    const size_t stride = g.Stride();
    const float scale = s.waveScale, high = set.epsHigh, low = set.epsLow;
    const int32_t started = -2 * set.firstWave - 1;
    const float* __restrict xi = g.xi.data();
    const float* __restrict prev2 = g.xiPrev2.data();
    int32_t* __restrict first = s.firstStep.data();
    int32_t* __restrict risen = s.risen.data();
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k) {
        const size_t o = k * stride;
        for (size_t p = o; p < o + stride; ++p) {
            if (first[p] >= 0) continue;
            const float r = (xi[p] - prev2[p]) / scale;
            if (r > high && risen[p] == 0)
                risen[p] = 1, first[p] -= 1;
            else if (r < low && risen[p] == 1)
                risen[p] = 0, first[p] -= 1;
            if (first[p] == started) first[p] = n;
        }
    }
}

// Type 3, first step after an output: every point starts anew at step n.
void RestartSums(int32_t n) {
    const GridState& g = gGrid;
    StatisticState& s = gStatistics;
    std::copy(g.xi.begin(), g.xi.end(), s.etaMax.begin());
    std::copy(g.xi.begin(), g.xi.end(), s.etaMin.begin());
    std::fill(s.samples.begin(), s.samples.end(), 0);
    std::fill(s.firstStep.begin(), s.firstStep.end(), n);
    for (std::vector<float>* v :
         {&s.sumEta, &s.sumEta2, &s.sumEta3, &s.sumEta4, &s.sumRate, &s.sumRate2, &s.sumRate3,
          &s.sumP, &s.sumQ, &s.sumU, &s.sumV, &s.sumDelta})
        std::fill(v->begin(), v->end(), 0.0f);
}

// The sample of step n at every started wet point. A point that takes no
// sample adds zeros and keeps its extremes, so that the pass has no branch;
// adding 0 leaves a sum as it is to the last bit. The roller fields are read
// only when rollers are on.
template <bool kRollers>
void AddSamples() {
    const GridState& g = gGrid;
    StatisticState& s = gStatistics;
    const size_t stride = g.Stride();
    const double dt = g.dt;
    const float* __restrict xi = g.xi.data();
    const float* __restrict prev2 = g.xiPrev2.data();
    const float* __restrict bed = g.bed.data();
    const float* __restrict depth = g.depth.data();
    const float* __restrict P = g.P.data();
    const float* __restrict Q = g.Q.data();
    const float* __restrict delta = kRollers ? gRollers.delta.data() : nullptr;
    const float* __restrict cx = kRollers ? gRollers.cx.data() : nullptr;
    const float* __restrict cy = kRollers ? gRollers.cy.data() : nullptr;
    const int32_t* __restrict first = s.firstStep.data();
    int32_t* __restrict samples = s.samples.data();
    float* __restrict etaMax = s.etaMax.data();
    float* __restrict etaMin = s.etaMin.data();
    float* __restrict s1 = s.sumEta.data();
    float* __restrict s2 = s.sumEta2.data();
    float* __restrict s3 = s.sumEta3.data();
    float* __restrict s4 = s.sumEta4.data();
    float* __restrict r1 = s.sumRate.data();
    float* __restrict r2 = s.sumRate2.data();
    float* __restrict r3 = s.sumRate3.data();
    float* __restrict sP = s.sumP.data();
    float* __restrict sQ = s.sumQ.data();
    float* __restrict sU = s.sumU.data();
    float* __restrict sV = s.sumV.data();
    float* __restrict sD = s.sumDelta.data();
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k) {
        const size_t o = k * stride;
#pragma GCC ivdep
        for (size_t p = o; p < o + stride; ++p) {
            const float x = xi[p];
            const bool wet = first[p] >= 0 && x - bed[p] > 0.0f;
            // Selects, not products: a dry point's velocity may be infinite.
            auto add = [wet](float v) { return wet ? v : 0.0f; };
            samples[p] += wet ? 1 : 0;
            etaMax[p] = wet && x > etaMax[p] ? x : etaMax[p];
            etaMin[p] = wet && x < etaMin[p] ? x : etaMin[p];
            const float x2 = x * x;
            s1[p] += add(x);
            s2[p] += add(x2);
            s3[p] += add(x2 * x);
            s4[p] += add(x2 * x2);
            const double r =
                wet ? (static_cast<double>(x) - static_cast<double>(prev2[p])) / dt : 0.0;
            r1[p] = static_cast<float>(r1[p] + r);
            r2[p] = static_cast<float>(r2[p] + r * r);
            r3[p] = static_cast<float>(r3[p] + r * r * r);
            sP[p] += add(P[p]);
            sQ[p] += add(Q[p]);
            if constexpr (kRollers) {
                const float d = delta[p], h = depth[p] - d;
                sD[p] += add(d);
                sU[p] += add((P[p] - cx[p] * d) / h);
                sV[p] += add((Q[p] - cy[p] * d) / h);
            } else {
                sU[p] += add(P[p] / depth[p]);
                sV[p] += add(Q[p] / depth[p]);
            }
        }
    }
}

// The value of an item at grid point p when written at step n, the delete
// value where the point has none.
float ItemValue(int32_t item, size_t p, int32_t n) {
    const StatisticState& s = gStatistics;
    const int32_t first = s.firstStep[p];
    if (item == 14) return first > 0 ? static_cast<float>(first * gGrid.dt) : kDeleteValue;
    const int32_t samples = s.samples[p];
    if (samples <= 0) return kDeleteValue;
    if (gStatisticOutput.meanCalculation != 2 && samples != n - first + 1) return kDeleteValue;
    const float N = static_cast<float>(samples);
    // Skewness of a family of sums from its raw moments.
    auto skewness = [&](float S1, float S2, float S3) {
        const double m1 = S1 / static_cast<double>(N), m2 = S2 / static_cast<double>(N),
                     m3 = S3 / static_cast<double>(N), var = m2 - m1 * m1;
        if (std::fabs(var) <= 1e-12) return kDeleteValue;
        return static_cast<float>(((-3.0 * m2 + 2.0 * m1 * m1) * m1 + m3) / std::pow(var, 1.5));
    };
    switch (item) {
        case 1: {
            if (samples < 2) return 1.0e-4f;
            const float v = (s.sumEta2[p] - s.sumEta[p] * s.sumEta[p] / N) / (N - 1.0f);
            const float H = v > 0.0f ? 4.0f * std::sqrt(v) : 0.0f;
            return std::max(H, 1.0e-4f);
        }
        case 2:
            return s.etaMax[p] - s.etaMin[p];
        case 3:
            return s.etaMax[p];
        case 4:
            return s.etaMin[p];
        case 5:
            return s.sumEta[p] / N;
        case 6:
            return s.sumP[p] / N;
        case 7:
            return s.sumQ[p] / N;
        case 8:
            return s.sumU[p] / N;
        case 9:
            return s.sumV[p] / N;
        case 10:
            return s.sumDelta[p] / N;
        case 11:
            return skewness(s.sumEta[p], s.sumEta2[p], s.sumEta3[p]);
        case 12: {
            const double m1 = s.sumEta[p] / static_cast<double>(N),
                         m2 = s.sumEta2[p] / static_cast<double>(N),
                         m3 = s.sumEta3[p] / static_cast<double>(N),
                         m4 = s.sumEta4[p] / static_cast<double>(N), var = m2 - m1 * m1;
            if (std::fabs(var) <= 1e-12) return kDeleteValue;
            return static_cast<float>(
                (((6.0 * m2 - 3.0 * m1 * m1) * m1 - 4.0 * m3) * m1 + m4) / (var * var) - 3.0);
        }
        case 13:
            return skewness(s.sumRate[p], s.sumRate2[p], s.sumRate3[p]);
        case 15:
        case 16:
        case 17:
            return kDeleteValue;  // no filtered series is kept
        default:
            StopRun("WriteOutputStatistic: Wrong type of item");
    }
}

void WriteRecord(OutputRecord2D& r, int32_t n) {
    const GridState& g = gGrid;
    const int32_t points = RecordPoints(r);
    for (int32_t point = 0; point < points; ++point) {
        const OutputSubGrid sub = RecordSubGrid(r, point);
        for (int32_t item : r.itemNumbers) {
            float* v = r.values.data();
            for (int32_t b = 0; b < sub.ny; ++b) {
                const int32_t k = sub.k0 + b * sub.dk;
                for (int32_t a = 0; a < sub.nx; ++a)
                    *v++ = ItemValue(item, g.At(sub.j0 + a * sub.dj, k), n);
            }
            XolWriteDynamic(r.file, r.values.data());
        }
    }
    XolFlush(r.file);
}

}  // namespace

void InitOutputStatistic() {
    const GridState& g = gGrid;
    const StatisticSettings& set = gStatisticOutput;
    StatisticState& s = gStatistics;
    const size_t n = g.Points();
    try {
        s.samples.assign(n, 0);
        s.firstStep.assign(n, set.type == 1 ? -1 : set.firstStep + 1);
        s.risen.assign(n, 0);
        for (std::vector<float>* v :
             {&s.etaMax, &s.etaMin, &s.sumEta, &s.sumEta2, &s.sumEta3, &s.sumEta4, &s.sumRate,
              &s.sumRate2, &s.sumRate3, &s.sumP, &s.sumQ, &s.sumU, &s.sumV, &s.sumDelta})
            v->assign(n, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    const DisturbanceSettings& d = gDisturbanceOutput;
    s.waveScale =
        d.type > 0 && d.scalingType == 1 && d.incomingHeight > 0.0f ? d.incomingHeight : 1.0f;
}

void CreateOutputStatistic() {
    const StatisticSettings& set = gStatisticOutput;
    for (OutputRecord2D& r : gStatisticOutput.records) {
        LockOutputFile("CreateOutputStatistic", r.fileName);
        CreateOutputRecordFile(r, kStatisticItems, set.firstStep + set.stepInterval,
                               set.stepInterval, 0);
    }
}

void UpdateOutputStatistic(int32_t step) {
    const StatisticSettings& set = gStatisticOutput;
    if (step <= set.firstStep || step > set.lastStep) return;
    if (set.type == 1) DetectFirstWave(step);
    if (set.type == 3 && (step - set.firstStep) % set.stepInterval == 1) RestartSums(step);
    if (RollersOn())
        AddSamples<true>();
    else
        AddSamples<false>();
}

void WriteOutputStatistic(int32_t step) {
    const StatisticSettings& set = gStatisticOutput;
    if (step < set.firstStep + set.stepInterval || step > set.lastStep ||
        (step - set.firstStep) % set.stepInterval != 0)
        return;
    for (OutputRecord2D& r : gStatisticOutput.records) WriteRecord(r, step);
}

void CloseOutputStatistic() {
    for (OutputRecord2D& r : gStatisticOutput.records) {
        if (r.file.mode != 2 || r.file.file == 0) continue;
        XolFlush(r.file);
        XolClose(r.file);
        UnlockOutputFile(r.fileName);
        XolPrintSummary(r.file);
    }
    gStatistics = StatisticState{};
}
