// The on-line statistics of the mesh solver against the statistics of the
// whole series computed here: nodes that start at their first wave, a node
// that dries, sums that restart each interval, and the low-pass filter at
// its cut-off period.
#include "meshsolver/statistics_bw.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <numbers>
#include <string>
#include <vector>

#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "support/test_support.hpp"

namespace {

constexpr double kDt = 0.05;
constexpr double kNoValue = -1.0e-30;

// Sums of a series and its central moments, written out here in full.
struct Moments {
    double n = 0, s1 = 0, s2 = 0, s3 = 0, s4 = 0;
    void Add(double v) { n += 1, s1 += v, s2 += v * v, s3 += v * v * v, s4 += v * v * v * v; }
    double Mean() const { return s1 / n; }
    double Central(int k) const {
        const double m = Mean(), e[5] = {1.0, s1 / n, s2 / n, s3 / n, s4 / n};
        double sum = 0.0, binomial = 1.0;
        for (int j = 0; j <= k; ++j) {
            sum += binomial * e[j] * std::pow(-m, k - j);
            binomial = binomial * (k - j) / (j + 1);
        }
        return sum;
    }
};

class WaveStatistic : public testing::Test {
protected:
    bwtest::TempDir dir;
    KvtHandle file = 0;
    BwModel model;
    std::vector<double> d, eta, rate, h, p, none;

    void Setup(const std::string& body, int32_t nodes) {
        if (file != 0) kvtClose(&file);
        bwtest::WriteFile(dir / "m_FEM.kvt",
                          "MeshSolverBW {\nWAVE_STATISTIC {\n" + body + "}\n}\n");
        file = KvtOpenFile(dir / "m_FEM.kvt", false);
        KvtUseFile(file);
        KvtOpenTarget("MeshSolverBW");
        ResetMeshModel();
        gMeshes.meshes[1].NodeCount = nodes;
        gMeshRun.LastStep = 1000;
        SetupWaveStatisticBW(model);
        for (std::vector<double>* v : {&eta, &rate, &h, &p}) v->assign(nodes + 1, 0.0);
        d.assign(nodes + 1, 1.0);
    }
    void Step(int32_t n) {
        for (size_t i = 1; i < eta.size(); ++i) h[i] = d[i] + eta[i];
        UpdateWaveStatisticBW(n, kDt, 1, static_cast<int32_t>(eta.size()) - 1, d, eta, rate, h, p,
                              none, 0, none, none, none);
    }
    double Item(int32_t n, int32_t item, int32_t node) {
        std::vector<double> work(eta.size());
        CalcPhaseAverageBW(n, item, work);
        return work[node];
    }
    void TearDown() override {
        if (file != 0) kvtClose(&file);
        gKvtAccess = KvtAccessState{};
        ResetWaveStatisticBW();
        ResetMeshModel();
        gMeshRun = MeshRunState{};
    }
};

// A skewed wave of 2 s at two nodes, the second half a period behind: each
// starts once a crest and a trough have passed it, by its rate against the
// limits, and from then on every statistic is that of its series from that
// step on.
TEST_F(WaveStatistic, EachNodeStartsAtItsFirstWave) {
    Setup("Type_of_wave_statistic = 1\nfirst_time_step = 0\nNumber_of_first_waves = 1\n", 2);
    const double omega = std::numbers::pi, a = 0.1;
    const int32_t last = 400;
    Moments m[3], r[3];
    double top[3] = {}, bottom[3] = {}, sumP[3] = {}, sumU[3] = {}, sxx[3] = {};
    int32_t start[3] = {-1, -1, -1}, risen[3] = {}, halves[3] = {};
    for (int32_t n = 1; n <= last; ++n) {
        for (int i = 1; i <= 2; ++i) {
            const double phase = omega * n * kDt - (i - 1) * std::numbers::pi;
            eta[i] = 0.02 + a * std::sin(phase) + 0.3 * a * std::sin(2.0 * phase);
            rate[i] = a * omega * (std::cos(phase) + 0.6 * std::cos(2.0 * phase));
            p[i] = 0.5 * eta[i];
            const double scaled = rate[i] * kDt;
            if (start[i] < 0 && ((scaled > 1e-4 && !risen[i]) || (scaled < -1e-4 && risen[i])))
                risen[i] = !risen[i], ++halves[i];
            if (start[i] < 0 && halves[i] == 2) start[i] = n;
        }
        Step(n);
        for (int i = 1; i <= 2; ++i) {
            if (start[i] < 0) continue;
            m[i].Add(eta[i]), r[i].Add(rate[i]);
            top[i] = std::max(top[i], eta[i]), bottom[i] = std::min(bottom[i], eta[i]);
            sumP[i] += p[i], sumU[i] += p[i] / h[i];
            sxx[i] += p[i] * p[i] / h[i] + 0.5 * 9.81f * eta[i] * eta[i];
        }
    }
    EXPECT_GT(start[2], start[1]) << "the second node meets the wave later";
    for (int i = 1; i <= 2; ++i) {
        EXPECT_EQ(gWaveStatisticBW.firstStep[i], start[i]);
        const double n = m[i].n, var = m[i].Central(2);
        EXPECT_EQ(gWaveStatisticBW.samples[i], last - start[i] + 1);
        EXPECT_NEAR(Item(last, 1, i), 4.0 * std::sqrt(var * n / (n - 1)), 1e-12);
        EXPECT_EQ(Item(last, 2, i), top[i] - bottom[i]);
        EXPECT_NEAR(Item(last, 5, i), m[i].Mean(), 1e-12);
        EXPECT_NEAR(Item(last, 6, i), sumP[i] / n, 1e-12);
        EXPECT_NEAR(Item(last, 8, i), sumU[i] / n, 1e-12);
        EXPECT_NEAR(Item(last, 11, i), m[i].Central(3) / std::pow(var, 1.5), 1e-8);
        EXPECT_NEAR(Item(last, 12, i), m[i].Central(4) / (var * var) - 3.0, 1e-8);
        EXPECT_NEAR(Item(last, 13, i), r[i].Central(3) / std::pow(r[i].Central(2), 1.5), 1e-8);
        EXPECT_NEAR(Item(last, 14, i), sxx[i] / n, 1e-12);
        EXPECT_EQ(Item(last - 1, 5, i), kNoValue) << "samples and steps disagree";
    }
}

// All nodes start together (type 2). A node that dries once loses its
// statistics with a mean by continuous wetness and keeps them with a mean
// by samples; a still node has no wave height and no skewness. Type 3
// restarts the sums each interval: the value at step n covers n - 9 to n.
TEST_F(WaveStatistic, DryingStillAndRestartingNodes) {
    for (const char* mean : {"1", "2"}) {
        Setup(std::string("Type_of_wave_statistic = 2\nfirst_time_step = 10\n") +
                  "Type_of_mean_calculation = " + mean + "\n",
              2);
        Moments wet;
        for (int32_t n = 1; n <= 30; ++n) {
            eta[1] = n == 20 ? -1.5 : 0.1 * std::sin(n * 0.7);
            if (n > 10 && n != 20) wet.Add(eta[1]);
            Step(n);
        }
        EXPECT_EQ(gWaveStatisticBW.samples[1], 19);
        EXPECT_NEAR(Item(30, 5, 1), mean[0] == '1' ? kNoValue : wet.Mean(), 1e-15);
        EXPECT_EQ(Item(30, 1, 2), kNoValue);
        EXPECT_EQ(Item(30, 11, 2), kNoValue);
        EXPECT_EQ(Item(30, 3, 2), 0.0);
    }
    Setup("Type_of_wave_statistic = 3\nfirst_time_step = 0\ntime_step_frequency = 10\n", 1);
    for (int32_t n = 1; n <= 30; ++n) {
        eta[1] = 0.05 * n;
        Step(n);
        if (n % 10 == 0) {
            EXPECT_NEAR(Item(n, 5, 1), 0.05 * (n - 4.5), 1e-12) << n;
            EXPECT_NEAR(Item(n, 4, 1), 0.05 * (n - 9), 1e-12) << n;
        }
    }
}

// The filter passes a constant, halves the power of a wave at its cut-off
// period T = 80 s and leaves 1 / 100 of a wave of T / 10 (second order);
// it runs at every call, outside the span of the sums too.
TEST_F(WaveStatistic, LowPassFilterResponse) {
    Setup("Type_of_wave_statistic = 1\nfirst_time_step = 100000\n", 3);
    const double periods[3] = {0.0, 80.0, 8.0};
    double top[3] = {};
    const int32_t steps = static_cast<int32_t>(20 * 80.0 / kDt);
    for (int32_t n = 1; n <= steps; ++n) {
        for (int i = 0; i < 3; ++i)
            eta[i + 1] = i == 0 ? 0.25 : std::sin(2.0 * std::numbers::pi * n * kDt / periods[i]);
        Step(n);
        for (int i = 0; n > steps / 2 && i < 3; ++i)
            top[i] = std::max(top[i], std::fabs(gWaveStatisticBW.filterEta.y[i + 1]));
    }
    EXPECT_NEAR(Item(steps, 17, 1), 0.25, 1e-9);
    EXPECT_NEAR(top[1], std::sqrt(0.5), 2e-3);
    EXPECT_NEAR(top[2], 0.01, 5e-4);
    EXPECT_EQ(Item(steps, 5, 1), kNoValue) << "no sample outside the span";
}

}  // namespace
