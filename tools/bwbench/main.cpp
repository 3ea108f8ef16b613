// bwbench: how fast the 2DH time loop runs. A flat basin of n x n points
// with a standing wave is stepped with each sweep family on 1 and 2 threads;
// the table gives the points computed per CPU second and per wall second
// (the CPS of the run statistics), next to the bandwidth of a plain copy of
// arrays of the same size measured in the same run, and the bytes a step
// moves per point by count of the arrays it reads and writes. The last table
// is the 1DH mesh solver on flumes (flume1d.cpp).
#include <omp.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "data/tsfunc.hpp"
#include "flume1d.hpp"
#include "output/statistics.hpp"
#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "run/process.hpp"
#include "run/timing.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

namespace {

// A closed basin of n x n points, 10 m deep, 5 m spacing, a standing wave
// on the diagonal, a Courant number of about 1.
void MakeBasin(int32_t n, int32_t handle, int32_t steps) {
    ResetRunState();
    GridState& g = gGrid;
    g.J = g.K = n - 1;
    g.dx = g.dy = 5.0f;
    g.timeStepCount = steps;
    g.bed.assign(g.Points(), -10.0f);
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j)
            if (j == 0 || k == 0 || j == g.J || k == g.K) g.bed[g.At(j, k)] = 1.0f;
    AllocateModelState();
    gEquation.convectiveHandle = handle;
    gEquation.extrapolationLower = 1.0f;
    gPorosity.porosity.assign(g.Points(), 1.0f);
    const double L = (n - 2) * g.dx, k = M_PI / L * 4.0;
    g.dt = 0.5;  // a Courant number of about 1
    for (int32_t kk = 0; kk <= g.K; ++kk)
        for (int32_t j = 0; j <= g.J; ++j) {
            const size_t p = g.At(j, kk);
            if (g.bed[p] > 0.0f) continue;
            g.xi[p] = g.xiPrev[p] = g.xiPrev2[p] =
                static_cast<float>(0.1 * std::cos(k * (j - 0.5) * g.dx) * std::cos(k * (kk - 0.5) * g.dy));
        }
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
    TsReset();
    TsInit(steps + 1);
}

// Bandwidth in GB/s of copying an array of the given number of floats,
// counting the bytes read and written, on the given number of threads.
double CopyBandwidth(size_t floats, int threads) {
    std::vector<float> a(floats, 1.0f), b(floats, 0.0f);
    omp_set_num_threads(threads);
    // At most a few thousand parallel loops: on a small grid each costs more
    // in starting and ending the loop than in copying.
    const int repeats = std::clamp<int>(static_cast<int>(2e8 / floats), 3, 2000);
    const double start = WallSeconds();
    for (int r = 0; r < repeats; ++r) {
#pragma omp parallel for schedule(static)
        for (size_t i = 0; i < floats; ++i) b[i] = a[i] + 0.0f * r;
    }
    const double seconds = WallSeconds() - start;
    volatile float sink = b[floats / 2];
    (void)sink;
    return 2.0 * 4.0 * floats * repeats / seconds / 1e9;
}

// Floats a time step reads and writes per point, by count of the arrays of
// each pass (extrapolation, boundary surface, depths, shift, assembly into
// the line buffers, solve), for the two halves together.
double BytesPerPoint(int32_t handle) {
    const double extrapolate = 7 + 1, depths = 2 * (2 + 1), shift = 2 + 2;
    const double assemble = handle == 0 ? 12 + 8 : 12 + 12 + 2;
    const double solve = handle == 0 ? 8 + 4 + 4 : 12 + 3;
    return 2.0 * 4.0 * (extrapolate + depths + shift + assemble + solve);
}

// The processes the table switches on, alone or together.
enum Process : unsigned { kRollers = 1, kEddy = 2, kGeneration = 4, kStatistics = 8 };

// Switches on processes of a coastal study on the basin as the model reader
// would set them up: rollers with their default settings, Smagorinsky eddy
// viscosity (coefficient 0.2), a generation line along k at j = 10 fed by a
// sine series; wave statistics of Type 1 over the whole run (every point
// starts at its first step, and the first-wave pass still runs), no file.
void AddProcesses(unsigned which, int32_t steps) {
    const GridState& g = gGrid;
    const size_t n = g.Points();
    gSponge.sponge.assign(n, 1.0f);
    if (which & kRollers) {
        RollerSettings& r = gRollers;
        r.type = 1;
        r.tanInitial = std::tan(20.0 * 0.01745329238474369);
        r.tanFinal = std::tan(10.0 * 0.01745329238474369);
        for (std::vector<float>* f : {&r.tanPhi, &r.tanPhiOld, &r.delta, &r.deltaOld, &r.cx,
                                      &r.cxOld, &r.cy, &r.cyOld})
            f->assign(n, 0.0f);
        for (size_t p = 0; p < n; ++p) {
            const double d = std::max(-static_cast<double>(g.bed[p]), r.minimumDepth);
            r.cx[p] = r.cxOld[p] = static_cast<float>(std::sqrt(9.81 * d) * r.velocityFactor);
            r.tanPhi[p] = r.tanPhiOld[p] = static_cast<float>(r.tanInitial);
        }
    }
    if (which & kEddy) {
        EddySettings& e = gEddy;
        e.eddyType = 2;
        e.smagorinskyCoef.assign(n, 0.2f);
        e.eddyViscosity.assign(n, 0.0f);
    }
    if (which & kStatistics) {
        StatisticSettings& s = gStatisticOutput;
        s = StatisticSettings{};
        s.type = 1, s.firstWave = 0, s.firstStep = 0, s.lastStep = 1 << 30, s.stepInterval = 1 << 30;
        InitOutputStatistic();
    }
    if (which & kGeneration) {
        GenerationState& s = gGeneration;
        InternalGenRecord rec;
        rec.pointCount = g.K - 2;
        for (int32_t k = 1; k <= g.K - 1; ++k) rec.pointJ.push_back(10), rec.pointK.push_back(k);
        std::vector<float> series(steps + 1);
        for (int32_t m = 0; m <= steps; ++m)
            series[m] = static_cast<float>(0.05 * std::sin(2.0 * M_PI * m * g.dt / 8.0));
        TsAddSeries(rec.seriesId, series.data());
        s.numberOfRecords = 1;
        s.records = {rec};
        s.lineFiles.resize(1);
        s.sourceIndex.assign(n, 0);
        for (int32_t i = 0; i <= rec.pointCount; ++i) {
            s.sourceIndex[g.At(10, rec.pointK[i])] = 2 * i + 1;
            s.sourceIndex[g.At(11, rec.pointK[i])] = 2 * i + 2;
        }
        s.sourceCount = 2 * (rec.pointCount + 1);
        for (std::vector<float>* v : {&s.sourceP, &s.sourcePPrev, &s.sourcePPrev2, &s.sourceQ,
                                      &s.sourceQPrev, &s.sourceQPrev2})
            v->assign(s.sourceCount + 1, 0.0f);
        s.lineValues.assign(std::max(g.J, g.K) + 1, 0.0f);
        s.deepValues = s.lineValues;
        s.genJ2 = g.J, s.genK2 = g.K;
    }
}

// Seconds of wall time per call of a routine, over `calls` calls.
template <typename F>
double PerCall(int32_t calls, F f) {
    const double start = WallSeconds();
    for (int32_t i = 0; i < calls; ++i) f(i);
    return (WallSeconds() - start) / calls;
}

struct StepCost {
    double step = 0.0, sweeps = 0.0, own = 0.0;  // seconds a step
};

// A run of `steps` steps on the basin with the processes given: the time of
// a step, of its two sweeps, and of the processes' own routines called
// again on the state the run left, as often as a step calls them.
StepCost MeasureStep(int32_t n, unsigned which, int32_t steps) {
    MakeBasin(n, 0, steps);
    AddProcesses(which, steps);
    SetThreads(1);
    PrepareTimeLoop();
    StepCost c;
    c.step = PerCall(steps, [](int32_t s) {
        ComputeStep(s + 1);
        gLoop.lineOrderFlag = !gLoop.lineOrderFlag;
    });
    c.sweeps = (gLoop.timing.tasks[kTaskXSweep - 1].wallTotal +
                gLoop.timing.tasks[kTaskYSweep - 1].wallTotal) / steps;
    if (which & kRollers)
        c.own += 2.0 * PerCall(steps, [](int32_t s) { CalcBreaking(nullptr, 1 + s % 2); });
    if (which & kEddy) c.own += PerCall(steps, [](int32_t) { CalcEddyViscosity(); });
    if (which & kGeneration)
        c.own += 2.0 * PerCall(steps, [&](int32_t s) { UpdateInternalGeneration(steps, 1 + s % 2); });
    if (which & kStatistics) {
        c.own += PerCall(steps, [](int32_t s) { UpdateOutputStatistic(s + 1); });
        CloseOutputStatistic();
        gStatisticOutput = StatisticSettings{};
    }
    ResetRunState();
    return c;
}

// What each process costs a step on one grid, 1 thread, central sweeps: its
// own routine, and what it adds to the sweeps (its terms, and for eddy
// viscosity and rollers the assembly of all lines before the solves), beside
// the step without processes. The wave statistics are called by the time
// loop after the step, not inside it: their cost is the own routine alone.
void ProcessTable(int32_t n, double scale) {
    const int32_t steps = std::max(4, static_cast<int32_t>(scale * 1e7 / (double(n) * n)));
    std::printf("\nprocesses on %dx%d, central sweeps, 1 thread, %d steps; ms a step\n", n, n,
                steps);
    std::printf("%-30s %9s %9s %13s %13s\n", "processes", "step", "sweeps", "own routine",
                "added");
    const StepCost bare = MeasureStep(n, 0, steps);
    const struct {
        const char* name;
        unsigned which;
    } rows[] = {{"none", 0},
                {"rollers", kRollers},
                {"Smagorinsky eddy viscosity", kEddy},
                {"internal generation", kGeneration},
                {"all three", kRollers | kEddy | kGeneration},
                {"wave statistics", kStatistics}};
    for (const auto& row : rows) {
        const StepCost c = row.which == 0 ? bare : MeasureStep(n, row.which, steps);
        std::printf("%-30s %9.2f %9.2f %13.2f %12.0f%%\n", row.name, 1e3 * c.step, 1e3 * c.sweeps,
                    1e3 * c.own, 100.0 * (c.step - bare.step) / bare.step);
    }
}

}  // namespace

int main(int argc, char** argv) {
    gProcess.processorCount = omp_get_num_procs();
    gProcess.maxThreads = omp_get_max_threads();
    // bwbench 1dh [scale [nodes]]: only the table of the 1DH flumes.
    if (argc > 1 && std::string(argv[1]) == "1dh") {
        FlumeTable(argc > 2 ? std::atof(argv[2]) : 1.0, argc > 3 ? std::atoi(argv[3]) : 0);
        return 0;
    }
    // bwbench [scale [n [family [threads]]]]: a shorter run for tests, or one
    // grid size (any n), sweep family (0 central, 1 and 2 upwind) and thread
    // count to profile; bwbench scale n processes: the table of the processes alone.
    const double scale = argc > 1 ? std::atof(argv[1]) : 1.0;
    const int32_t onlyN = argc > 2 ? std::atoi(argv[2]) : 0;
    // "processes" in place of the family: only the table of the processes.
    const bool onlyProcesses = argc > 3 && std::string(argv[3]) == "processes";
    const int32_t onlyHandle = argc > 3 && !onlyProcesses ? std::atoi(argv[3]) : -1;
    const int onlyThreads = argc > 4 ? std::atoi(argv[4]) : 0;
    std::printf("%-11s %-11s %7s %13s %13s %8s %8s %9s %8s %8s\n", "grid", "sweeps", "threads",
                "points/cpu-s", "points/wall-s", "x-sweep", "y-sweep", "copy GB/s", "B/point",
                "GB/s");
    // One size given on the command line may be any size, for finding where
    // a second thread starts to gain.
    const std::vector<int32_t> sizes = onlyN > 0 ? std::vector<int32_t>{onlyN}
                                                 : std::vector<int32_t>{200, 500, 1000};
    for (int32_t n : sizes) {
        if (onlyProcesses) continue;
        const int32_t steps = std::max(2, static_cast<int32_t>(scale * 4e7 / (double(n) * n)));
        for (int32_t handle : {0, 1, 2}) {
            if (onlyHandle >= 0 && handle != onlyHandle) continue;
            for (int threads : {1, 2}) {
                if (onlyThreads > 0 && threads != onlyThreads) continue;
                MakeBasin(n, handle, steps);
                SetThreads(threads);
                PrepareTimeLoop();
                const double cpu0 = CpuSeconds(), wall0 = WallSeconds();
                for (int32_t s = 1; s <= steps; ++s) {
                    ComputeStep(s);
                    gLoop.lineOrderFlag = !gLoop.lineOrderFlag;
                }
                const double cpu = CpuSeconds() - cpu0, wall = WallSeconds() - wall0;
                const double points = static_cast<double>(gChains.activePoints) * steps;
                const double copy = CopyBandwidth(gGrid.Points(), threads);
                const double bytes = BytesPerPoint(handle);
                const char* name = handle == 0 ? "central" : handle == 1 ? "upwind h=1" : "upwind h=2";
                char grid[32];
                std::snprintf(grid, sizeof grid, "%dx%d", n, n);
                // Share of the wall time in each sweep; the rest is extrapolation, depths and shifts.
                const double xs = gLoop.timing.tasks[kTaskXSweep - 1].wallTotal / wall;
                const double ys = gLoop.timing.tasks[kTaskYSweep - 1].wallTotal / wall;
                std::printf("%-11s %-11s %7d %13.3e %13.3e %7.0f%% %7.0f%% %9.2f %8.0f %8.2f\n", grid,
                            name, threads, points / cpu, points / wall, 100.0 * xs, 100.0 * ys, copy,
                            bytes, points / wall * bytes / 1e9);
                std::fflush(stdout);
            }
        }
    }
    if (onlyHandle < 0) ProcessTable(onlyN > 0 ? onlyN : 500, scale);
    // The whole bench (no grid size given) ends with the 1DH flumes.
    if (onlyN <= 0) FlumeTable(scale, 0);
    return 0;
}
