#include "solver2d/basin.hpp"

#include <omp.h>

#include "data/tsfunc.hpp"
#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "run/process.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

namespace bwtest {

void MakeBasin(const BasinSpec& s) {
    ResetModelState();
    gPorosity = PorositySettings{};
    gShoreline = ShorelineSettings{};
    gSponge = SpongeSettings{};
    gFilter = FilterSettings{};
    gFriction = FrictionSettings{};
    gEddy = EddySettings{};
    gRollers = RollerSettings{};
    gGeneration = GenerationState{};
    gBoundaries = BoundaryState{};
    GridState& g = gGrid;
    g.J = s.J, g.K = s.K, g.dx = s.dx, g.dy = s.dy, g.dt = s.dt;
    g.timeStepCount = s.steps;
    g.lastStep = s.steps - 1;
    g.landValue = 0.0f;
    g.bed.assign(g.Points(), -s.depth);
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j)
            if ((j == 0 && s.frameWest) || j == g.J || k == 0 || k == g.K) g.bed[g.At(j, k)] = 1.0f;
    AllocateModelState();
    gEquation.deepWaterTerms = s.deepWater;
    gEquation.dispersionFactor = s.deepWater ? s.dispersionFactor : 0.0f;
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

double WaterVolume() {
    const GridState& g = gGrid;
    return SumWater([&](int, int, size_t p) { return static_cast<double>(g.xi[p]); }) * g.dx * g.dy;
}

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
        num += s * g.xi[p];
        den += s * s;
        return 0.0;
    });
    return num / den;
}

std::vector<double> ZeroCrossings(const std::vector<double>& v, double dt) {
    std::vector<double> t;
    for (size_t i = 1; i < v.size(); ++i)
        if ((v[i - 1] < 0.0) != (v[i] < 0.0)) t.push_back(dt * ((i - 1) + v[i - 1] / (v[i - 1] - v[i])));
    return t;
}

}  // namespace bwtest
