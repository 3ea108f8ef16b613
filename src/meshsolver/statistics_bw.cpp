#include "meshsolver/statistics_bw.hpp"

#include <algorithm>
#include <cmath>
#include <new>

#include "input/kvt_current.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "run/messages.hpp"

WaveStatisticBW gWaveStatisticBW;

namespace {

constexpr double kGravity = static_cast<double>(9.81f);
constexpr double kNoValue = -1.0e-30;
constexpr double kTwoSqrtTwo = 2.8284271247461903;

template <typename T>
void Size(std::vector<T>& v, size_t n, T value) {
    try {
        v.assign(n, value);
    } catch (const std::bad_alloc&) {
        StopRun("SetupWaveStatisticBW: Out of memory");
    }
}

void SizeFilter(LowPassStateBW& f, size_t n) {
    for (std::vector<double>* v : {&f.x1, &f.x2, &f.y1, &f.y2, &f.y}) Size(*v, n, 0.0);
}

double At(const std::vector<double>& v, int32_t i) {
    return v.empty() ? 0.0 : v[i];
}

// Every sum and the extremes of one node back to the start of a span.
void RestartNode(WaveStatisticBW& s, int32_t i, int32_t step, double eta) {
    s.samples[i] = 0;
    s.firstStep[i] = step;
    s.etaMax[i] = s.etaMin[i] = eta;
    for (std::vector<double>* v :
         {&s.sumEta, &s.sumEta2, &s.sumEta3, &s.sumEta4, &s.sumRate, &s.sumRate2, &s.sumRate3,
          &s.sumP, &s.sumQ, &s.sumU, &s.sumV, &s.sumDelta, &s.sumSxx, &s.sumSxy, &s.sumSyy})
        (*v)[i] = 0.0;
}

// Type 1: counts the half waves passing a node that has not started, by the
// scaled rate r = eta_t dt against the two limits.
void DetectFirstWave(WaveStatisticBW& s, int32_t i, int32_t step, double r) {
    if (s.firstWaves == 0) {
        s.firstStep[i] = step;
        return;
    }
    if (r > s.highLimit && s.risen[i] == 0) {
        s.risen[i] = 1;
        --s.firstStep[i];
    } else if (r < s.lowLimit && s.risen[i] == 1) {
        s.risen[i] = 0;
        --s.firstStep[i];
    }
    if (s.firstStep[i] == -1 - 2 * s.firstWaves) s.firstStep[i] = step;
}

void Filter(LowPassStateBW& f, int32_t i, double x, double b0, double b1, double a1, double a2) {
    const double y = b0 * (x + f.x2[i]) + b1 * f.x1[i] + a1 * f.y1[i] + a2 * f.y2[i];
    f.x2[i] = f.x1[i];
    f.y2[i] = f.y1[i];
    f.x1[i] = x;
    f.y1[i] = y;
    f.y[i] = y;
}

// The skewness of the family S1..S3 over N samples, or no value where the
// variance vanishes.
double Skewness(double n, double s1, double s2, double s3) {
    const double m1 = s1 / n, m2 = s2 / n, m3 = s3 / n, var = m2 - m1 * m1;
    if (std::fabs(var) <= 1.0e-12) return kNoValue;
    return ((-3.0 * m2 + 2.0 * m1 * m1) * m1 + m3) / std::pow(var, 1.5);
}

double Kurtosis(double n, double s1, double s2, double s3, double s4) {
    const double m1 = s1 / n, m2 = s2 / n, m3 = s3 / n, m4 = s4 / n, var = m2 - m1 * m1;
    if (std::fabs(var) <= 1.0e-12) return kNoValue;
    return (((6.0 * m2 - 3.0 * m1 * m1) * m1 - 4.0 * m3) * m1 + m4) / (var * var) - 3.0;
}

// The value of item at a valid node i with N samples.
double NodeValue(const WaveStatisticBW& s, int32_t item, int32_t i) {
    const double n = s.samples[i];
    switch (item) {
        case 1: {
            if (s.samples[i] <= 1) return kNoValue;
            const double v = (s.sumEta2[i] - s.sumEta[i] * s.sumEta[i] / n) / (n - 1.0);
            return v > 0.0 ? 4.0 * std::sqrt(v) : kNoValue;
        }
        case 2:
            return s.etaMax[i] - s.etaMin[i];
        case 3:
            return s.etaMax[i];
        case 4:
            return s.etaMin[i];
        case 5:
            return s.sumEta[i] / n;
        case 6:
            return s.sumP[i] / n;
        case 7:
            return s.sumQ[i] / n;
        case 8:
            return s.sumU[i] / n;
        case 9:
            return s.sumV[i] / n;
        case 10:
            return s.sumDelta[i] / n;
        case 11:
            return Skewness(n, s.sumEta[i], s.sumEta2[i], s.sumEta3[i]);
        case 12:
            return Kurtosis(n, s.sumEta[i], s.sumEta2[i], s.sumEta3[i], s.sumEta4[i]);
        case 13:
            return Skewness(n, s.sumRate[i], s.sumRate2[i], s.sumRate3[i]);
        case 14:
            return s.sumSxx[i] / n;
        case 15:
            return s.sumSxy[i] / n;
        case 16:
            return s.sumSyy[i] / n;
        default:
            return kNoValue;
    }
}

}  // namespace

void ResetWaveStatisticBW() {
    gWaveStatisticBW = WaveStatisticBW{};
}

void SetupWaveStatisticBW(BwModel& model) {
    WaveStatisticBW& s = gWaveStatisticBW;
    s = WaveStatisticBW{};
    const int32_t last = gMeshRun.LastStep;
    s.first_time_step = model.startTimeStep;
    s.last_time_step = last;
    s.time_step_frequency = last - model.startTimeStep;
    KvtOpenSection("WAVE_STATISTIC");
    KvtGetInteger("Type_of_wave_statistic", s.type);
    if (s.type > 0) {
        KvtGetInteger("Type_of_mean_calculation", s.meanCalculation);
        KvtGetInteger("first_time_step", s.first_time_step);
        KvtGetInteger("last_time_step", s.last_time_step);
        // The model reader writes this key with a capital, and keys are
        // matched as written: the end of the statistics that the model
        // file gives would otherwise never arrive.
        KvtGetInteger("Last_time_step", s.last_time_step);
        KvtGetInteger("time_step_frequency", s.time_step_frequency);
        KvtGetInteger("Number_of_first_waves", s.firstWaves);
        KvtGetDouble("High_elevation_limit", s.highLimit);
        KvtGetDouble("Low_elevation_limit", s.lowLimit);
        KvtGetDouble("period_low_pass_filter", s.filterPeriod);
        // The interval of type 3 divides the distance from the first step.
        if (s.type == 3 && s.time_step_frequency < 1)
            StopRun("SetupWaveStatisticBW: time_step_frequency must be at least 1");
        if (s.filterPeriod <= 0.0)
            StopRun("SetupWaveStatisticBW: period_low_pass_filter must be larger than zero");
    }
    KvtCloseSection();
    if (s.type <= 0) return;

    s.nodes = gMeshes.meshes[model.ElevationMesh].NodeCount;
    const size_t n = static_cast<size_t>(s.nodes) + 1;
    Size(s.samples, n, 0);
    Size(s.firstStep, n, s.type == 1 ? -1 : s.first_time_step + 1);
    Size(s.risen, n, 0);
    for (std::vector<double>* v :
         {&s.etaMax, &s.etaMin, &s.sumEta, &s.sumEta2, &s.sumEta3, &s.sumEta4, &s.sumRate,
          &s.sumRate2, &s.sumRate3, &s.sumP, &s.sumQ, &s.sumU, &s.sumV, &s.sumDelta, &s.sumSxx,
          &s.sumSxy, &s.sumSyy})
        Size(*v, n, 0.0);
    SizeFilter(s.filterP, n);
    SizeFilter(s.filterQ, n);
    SizeFilter(s.filterEta, n);
}

void UpdateWaveStatisticBW(int32_t step, double timeStep, int32_t dimensions, int32_t nodes,
                           const std::vector<double>& stillDepth, const std::vector<double>& eta,
                           const std::vector<double>& etaRate, const std::vector<double>& h,
                           const std::vector<double>& p, const std::vector<double>& q,
                           int32_t rollerType, const std::vector<double>& delta,
                           const std::vector<double>& cx, const std::vector<double>& cy) {
    WaveStatisticBW& s = gWaveStatisticBW;
    if (s.type <= 0 || s.samples.empty()) return;
    const bool rollers = rollerType > 0 && !delta.empty();
    const int32_t n = step;
    if (s.first_time_step < n && n <= s.last_time_step) {
        if (s.type == 3 && (n - s.first_time_step) % s.time_step_frequency == 1)
            for (int32_t i = 1; i <= nodes; ++i) RestartNode(s, i, n, eta[i]);
        if (s.type == 1)
            for (int32_t i = 1; i <= nodes; ++i)
                if (s.firstStep[i] < 0) DetectFirstWave(s, i, n, At(etaRate, i) * timeStep);
        for (int32_t i = 1; i <= nodes; ++i) {
            if (s.firstStep[i] < 0 || !(stillDepth[i] + eta[i] > 0.0)) continue;
            const double e = eta[i], r = At(etaRate, i), d = rollers ? delta[i] : 0.0;
            ++s.samples[i];
            s.etaMax[i] = std::max(s.etaMax[i], e);
            s.etaMin[i] = std::min(s.etaMin[i], e);
            s.sumEta[i] += e;
            s.sumEta2[i] += e * e;
            s.sumEta3[i] += e * e * e;
            s.sumEta4[i] += e * e * e * e;
            s.sumDelta[i] += d;
            s.sumRate[i] += r;
            s.sumRate2[i] += r * r;
            s.sumRate3[i] += r * r * r;
            s.sumP[i] += p[i];
            s.sumU[i] += rollers ? (p[i] - d * At(cx, i)) / (h[i] - d) : p[i] / h[i];
            s.sumSxx[i] += p[i] * p[i] / h[i] + 0.5 * kGravity * e * e;
            if (dimensions > 1) {
                const double qi = At(q, i);
                s.sumQ[i] += qi;
                s.sumV[i] += rollers ? (qi - d * At(cy, i)) / (h[i] - d) : qi / h[i];
                s.sumSxy[i] += p[i] * qi / h[i];
                s.sumSyy[i] += qi * qi / h[i] + 0.5 * kGravity * e * e;
            }
        }
    }

    const double w = timeStep * 2.0 * M_PI / s.filterPeriod;
    const double D = w * w + kTwoSqrtTwo * w + 4.0;
    const double b0 = w * w / D, b1 = 2.0 * w * w / D, a1 = 2.0 * (4.0 - w * w) / D;
    const double a2 = ((kTwoSqrtTwo - w) * w - 4.0) / D;
    for (int32_t i = 1; i <= nodes; ++i) {
        Filter(s.filterP, i, p[i], b0, b1, a1, a2);
        Filter(s.filterQ, i, At(q, i), b0, b1, a1, a2);
        Filter(s.filterEta, i, eta[i], b0, b1, a1, a2);
    }
}

void CalcPhaseAverageBW(int32_t step, int32_t item, std::vector<double>& work) {
    const WaveStatisticBW& s = gWaveStatisticBW;
    std::fill(work.begin(), work.end(), kNoValue);
    if (s.samples.empty()) return;
    const int32_t nodes = std::min<int32_t>(s.nodes, static_cast<int32_t>(work.size()) - 1);
    const LowPassStateBW* filtered = item == 17   ? &s.filterEta
                                     : item == 18 ? &s.filterP
                                     : item == 19 ? &s.filterQ
                                                  : nullptr;
    for (int32_t i = 1; i <= nodes; ++i) {
        if (filtered != nullptr) {
            work[i] = filtered->y[i];
            continue;
        }
        const bool valid = s.samples[i] > 0 &&
                           (s.meanCalculation == 2 || s.samples[i] == step - s.firstStep[i] + 1);
        if (valid) work[i] = NodeValue(s, item, i);
    }
}
