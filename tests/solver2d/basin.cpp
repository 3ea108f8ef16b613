#include "solver2d/basin.hpp"

#include <omp.h>

#include <cmath>
#include <numbers>

#include "data/geoframe.hpp"
#include "data/tsfunc.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/sponge.hpp"
#include "run/process.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

namespace bwtest {

constexpr double kPi = std::numbers::pi;

void MakeBasin(const BasinSpec& s) {
    ResetModelState();
    gPorosity = PorositySettings{};  // the processes the tests switch on
    gSponge = SpongeSettings{};
    gFilter = FilterSettings{};
    gBoundaries = BoundaryState{};
    GridState& g = gGrid;
    g.J = s.J, g.K = s.K, g.dx = s.dx, g.dy = s.dy, g.dt = s.dt;
    g.timeStepCount = s.steps;
    g.bed.assign(g.Points(), -1.0f);
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j)
            if ((j == 0 && s.frameWest) || j == g.J || k == 0 || k == g.K) g.bed[g.At(j, k)] = 1.0f;
    AllocateModelState();
    gEquation.deepWaterTerms = s.deepWater;
    gEquation.dispersionFactor = s.deepWater ? 1.0f / 15.0f : 0.0f;
    gEquation.convectiveHandle = s.convectiveHandle;
    gEquation.extrapolationLower = s.deepWater ? s.extrapolation : 1.0f;
    gPorosity.porosity.assign(g.Points(), 1.0f);
    gSponge.sponge.assign(g.Points(), 1.0f);
    gProcess.processorCount = omp_get_num_procs();
    gProcess.maxThreads = omp_get_max_threads();
    SetThreads(s.threads);
    TsReset();
    TsInit(s.steps + 1);
    SetSurface([](float, float) { return 0.0f; });
}

void SetSurface(const std::function<float(float, float)>& surface) {
    GridState& g = gGrid;
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j) {
            const size_t p = g.At(j, k);
            g.xi[p] = g.xiPrev[p] = g.xiPrev2[p] = surface(j * g.dx, k * g.dy);
        }
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
}

void RunSteps(int32_t steps, const std::function<void(int32_t)>& after) {
    PrepareTimeLoop();
    for (int32_t n = 1; n <= steps; ++n) {
        ComputeStep(n);
        if (after) after(n);
        gLoop.lineOrderFlag = !gLoop.lineOrderFlag;
    }
}

namespace {
template <typename F>
double SumWater(F f) {
    const GridState& g = gGrid;
    double sum = 0.0;
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j)
            if (g.bed[g.At(j, k)] < g.landValue) sum += f(j, k, g.At(j, k));
    return sum;
}
}  // namespace

double TotalVolume() {
    const GridState& g = gGrid;
    return SumWater([&](int, int, size_t p) { return static_cast<double>(g.xi[p]) - g.bed[p]; }) *
           g.dx * g.dy;
}

double Project(const std::function<double(float, float)>& shape) {
    const GridState& g = gGrid;
    double num = 0.0, den = 0.0;
    SumWater([&](int j, int k, size_t p) {
        const double s = shape(j * g.dx, k * g.dy);
        num += s * g.xi[p], den += s * s;
        return 0.0;
    });
    return num / den;
}

std::vector<double> ZeroCrossings(const std::vector<double>& v, double dt) {
    std::vector<double> t;
    for (size_t i = 1; i < v.size(); ++i)
        if ((v[i - 1] < 0.0) != (v[i] < 0.0))
            t.push_back(dt * ((i - 1) + v[i - 1] / (v[i - 1] - v[i])));
    return t;
}

double Omega2(double k, double d, double B) {
    const double kd = k * d;
    return static_cast<double>(kGravity) * d * k * k * (1.0 + B * kd * kd) /
           (1.0 + (B + 1.0 / 3.0) * kd * kd);
}

double WaveNumber(double omega, double d, double B) {
    double lo = 1e-6, hi = 100.0;
    for (int i = 0; i < 200; ++i)
        (Omega2(0.5 * (lo + hi), d, B) < omega * omega ? lo : hi) = 0.5 * (lo + hi);
    return 0.5 * (lo + hi);
}

void AddWestBoundary(int32_t formulation, const std::vector<float>& series,
                     const std::vector<float>& deep) {
    BoundaryRecord r;
    r.first[0] = 0, r.first[1] = 1, r.last[0] = 0, r.last[1] = gGrid.K - 1;
    r.orientation = 1, r.formulation = formulation;
    TsAddSeries(r.seriesId, series.data());
    if (!deep.empty()) TsAddSeries(r.deepSeriesId, deep.data());
    gBoundaries.numberOfBoundaries = 1;
    gBoundaries.records = {r};
    BoundaryTable table;
    table.rows = gGrid.K - 1;
    table.values.assign(6 * table.rows, 0.0f);
    for (int32_t row = 0; row < table.rows; ++row)
        table.Value(row, 2) = static_cast<float>(formulation);
    gBoundaries.boundaryValues = {table};
}

void ClearGeneration() {
    for (InternalLineFile& l : gGeneration.lineFiles)
        if (l.file.mode == 1) XolClose(l.file);
    gGeneration = GenerationState{};
}

Channel MakeChannel(int32_t formulation, bool deep, double T, double a, int32_t waves,
                    int32_t periods) {
    const double B = deep ? static_cast<double>(1.0f / 15.0f) : 0.0, omega = 2.0 * kPi / T;
    Channel ch;
    ch.k = WaveNumber(omega, 1.0, B), ch.c = omega / ch.k, ch.dt = T / 60.0, ch.J = 30 * waves,
    ch.steps = 60 * periods;
    BasinSpec s;
    s.dx = s.dy = static_cast<float>(2.0 * kPi / ch.k / 30.0);
    s.J = ch.J, s.K = 4, s.dt = ch.dt, s.steps = ch.steps, s.frameWest = false, s.deepWater = deep;
    MakeBasin(s);
    ch.dx = s.dx;

    std::vector<float> series(s.steps + 1), across(s.steps + 1);
    const double amplitude = formulation == 0 ? a : a * ch.c, ramp = 4.0 * T;
    for (int32_t n = 0; n <= s.steps; ++n) {
        const double t = n * s.dt, rise = t < ramp ? 0.5 * (1.0 - std::cos(kPi * t / ramp)) : 1.0;
        series[n] = static_cast<float>(amplitude * rise * std::sin(omega * t));
        across[n] = static_cast<float>(
            formulation == 0 ? -ch.k * ch.k * a * rise * std::sin(omega * t)
                             : -ch.k * a * rise * std::cos(omega * t - ch.k * 0.5 * s.dx));
    }
    AddWestBoundary(formulation, series, deep ? across : std::vector<float>{});
    return ch;
}

void MakeRow(const std::vector<float>& bed, double dt) {
    ResetModelState();
    GridState& g = gGrid;
    g.J = static_cast<int32_t>(bed.size()) - 1, g.K = 0, g.dx = g.dy = 1.0f, g.dt = dt;
    g.bed = bed;
    AllocateModelState();
    GeoFrameOpen(g.frame, "NON-UTM", 0.0, 0.0, 0.0);
}

void DriveRow(int32_t steps, const std::function<double(int32_t, int32_t)>& surface,
              const std::function<void(int32_t)>& output) {
    GridState& g = gGrid;
    for (int32_t n = 0; n <= steps; ++n) {
        for (int32_t j = 0; j <= g.J; ++j) {
            g.xiPrev2[j] = g.xi[j];
            g.xi[j] = g.bed[j] < 0.0f ? static_cast<float>(surface(j, n)) : 0.0f;
            g.depth[j] = g.xi[j] - g.bed[j];
        }
        output(n);
    }
}

}  // namespace bwtest
