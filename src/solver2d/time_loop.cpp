#include "solver2d/time_loop.hpp"

#include <omp.h>

#include <cmath>
#include <string>
#include <vector>

#include "output/deterministic.hpp"
#include "output/disturbance.hpp"
#include "output/hotstart.hpp"
#include "output/statistics.hpp"
#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "data/tsfunc.hpp"
#include "run/messages.hpp"
#include "run/progress.hpp"
#include "run/run_state.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/grid_filter.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/sweeps.hpp"

TimeLoopState gLoop;

namespace {

void StartLoopTasks() {
    StartTiming(gOverallTiming, kTaskCalculation);
    StartTiming(gLoop.timing, kTaskSimulationTotal);
    StartTiming(gLoop.timing, kTaskOtherCalculation);
}

void StopLoopTasks() {
    StopTiming(gLoop.timing, kTaskOtherCalculation);
    StopTiming(gLoop.timing, kTaskSimulationTotal);
    StopTiming(gOverallTiming, kTaskCalculation);
}

// One half of a step: the source values of internal generation, the surface
// estimate for the sweep, its boundary values and depth, the rollers, the
// shift of the surface levels, the sweep, and the damping behind it.
void HalfStep(int32_t axis, int32_t step) {
    GridState& g = gGrid;
    float* xiExt = axis == 1 ? g.xiExtX.data() : g.xiExtY.data();
    float* depthExt = axis == 1 ? g.depthExtX.data() : g.depthExtY.data();
    if (gGeneration.numberOfRecords > 0) UpdateInternalGeneration(step, axis);
    if (axis == 1)
        ExtrapolateSurfaceElevationX(xiExt);
    else
        ExtrapolateSurfaceElevationY(xiExt);
    SetBoundarySurface(axis, xiExt);
    CalculateDepth(g.J, g.K, depthExt, g.bed.data(), xiExt);
    // The rollers see xi as the level just reached, xiPrev half a step and
    // xiPrev2 a whole step older: before the shift.
    if (gRollers.type == 1) CalcBreaking(xiExt, axis);
    ShiftSurfaceLevels();

    const int task = axis == 1 ? kTaskXSweep : kTaskYSweep;
    StopTiming(gLoop.timing, kTaskOtherCalculation);
    StartTiming(gLoop.timing, task);
    const bool flag = gLoop.lineOrderFlag;
    if (gEquation.convectiveHandle == 0)
        axis == 1 ? XSweep(flag, step) : YSweep(flag, step);
    else
        axis == 1 ? XSweep_New(flag, step) : YSweep_New(flag, step);
    StopTiming(gLoop.timing, task);
    StartTiming(gLoop.timing, kTaskOtherCalculation);

    if (gShoreline.type > 0) LimitOutflow(axis);
    if (gFilter.type > 0) axis == 1 ? CalcFilterX() : CalcFilterY();
    if (gSponge.spongeType) AbsorpWaveEnergy();
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
}

}  // namespace

void CalculateDepth(int32_t J, int32_t K, float* target, const float* bed, const float* surface) {
    const size_t stride = static_cast<size_t>(J) + 1;
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= K; ++k) {
        const size_t o = k * stride;
        for (size_t j = 0; j < stride; ++j) target[o + j] = surface[o + j] - bed[o + j];
    }
    if (gShoreline.type > 0) SlotCorrection(target, bed);
}

void ShiftSurfaceLevels() {
    GridState& g = gGrid;
    const size_t stride = g.Stride();
    float* xi = g.xi.data();
    float* prev = g.xiPrev.data();
    float* prev2 = g.xiPrev2.data();
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k) {
        const size_t o = k * stride;
        for (size_t j = 0; j < stride; ++j) {
            prev2[o + j] = prev[o + j];
            prev[o + j] = xi[o + j];
        }
    }
}

namespace {

// The surface at the next half level from the continuity equation over one
// whole step, each flux taken at the time level the weights give: wA on the
// newer and 1 - wA on the older flux along the chains, wC and 1 - wC across.
// axis 1: the points of the y chains (xiExtX); axis 2: those of the x chains.
// The points come from the chains' marks, so that the pass runs along the
// rows of the fields whichever the axis; the rows inside the grid without
// slot take a straight pass over j, and the points of generation lines are
// done once more with their sources.
void Extrapolate(int32_t axis, float* xiExt) {
    const GridState& g = gGrid;
    const bool x = axis == 1;
    const size_t stride = g.Stride();
    const float* __restrict P = g.P.data();
    const float* __restrict PPrev = g.PPrev.data();
    const float* __restrict Q = g.Q.data();
    const float* __restrict QPrev = g.QPrev.data();
    const float* __restrict xiPrev = g.xiPrev.data();
    const float* __restrict xi = g.xi.data();
    const float* __restrict por = gPorosity.porosity.data();
    const uint8_t* __restrict mark = x ? gChains.surfaceX.data() : gChains.surfaceY.data();
    float* __restrict out = xiExt;
    const float wP = x ? 0.875f : 0.375f, wPo = x ? 0.125f : 0.625f;
    const float wQ = x ? 0.375f : 0.875f, wQo = x ? 0.625f : 0.125f;
    const bool slot = gShoreline.type > 0;
    const bool gen = gGeneration.numberOfRecords > 0;
    const double dt = g.dt;
    const float dx = g.dx, dy = g.dy;

    // Any point, at the grid's edges too and with every process.
    auto point = [&](size_t p, int32_t j, int32_t k) {
        const bool single = mark[p] == 2;
        const float Pw = j > 0 ? P[p - 1] : g.PWest[k];
        const float PwO = j > 0 ? PPrev[p - 1] : g.PWest[k];
        const float Qs = k > 0 ? Q[p - stride] : g.QSouth[j];
        const float QsO = k > 0 ? QPrev[p - stride] : g.QSouth[j];
        float sP = 0.0f, sQ = 0.0f;
        if (gen) {
            const int32_t s = gGeneration.sourceIndex[p];
            if (s >= 1) {
                sP = wP * gGeneration.sourceP[s] + wPo * gGeneration.sourcePPrev[s];
                sQ = wQ * gGeneration.sourceQ[s] + wQo * gGeneration.sourceQPrev[s];
            }
        }
        const float dPx = (P[p] - Pw) * wP + (PPrev[p] - PwO) * wPo - sP;
        const float dQy = (Q[p] - Qs) * wQ + (QPrev[p] - QsO) * wQo - sQ;
        // Along a chain of one point only the flux along the line counts.
        const float div = single ? (x ? dPx / dx : dQy / dy) : dPx / dx + dQy / dy;
        const float c = slot ? StorageWidthAt(j, k, xi[p]) : 1.0f;
        out[p] = static_cast<float>(xiPrev[p] - dt * div / (por[p] * c));
    };
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k) {
        const size_t o = k * stride;
        if (k == 0 || slot) {
            for (int32_t j = 0; j <= g.J; ++j)
                if (mark[o + j] != 0) point(o + j, j, k);
            continue;
        }
        if (mark[o] != 0) point(o, 0, k);
        // The same sums as above with no source and a storage width of 1,
        // computed at every point and kept at the marked ones.
#pragma GCC ivdep
        for (size_t p = o + 1; p < o + stride; ++p) {
            const float dPx = (P[p] - P[p - 1]) * wP + (PPrev[p] - PPrev[p - 1]) * wPo;
            const float dQy = (Q[p] - Q[p - stride]) * wQ + (QPrev[p] - QPrev[p - stride]) * wQo;
            const float div = mark[p] == 2 ? (x ? dPx / dx : dQy / dy) : dPx / dx + dQy / dy;
            const float value = static_cast<float>(xiPrev[p] - dt * div / por[p]);
            out[p] = mark[p] != 0 ? value : out[p];
        }
        // The sources of generation lines, at their points once more.
        if (gen) {
            const int32_t* source = gGeneration.sourceIndex.data() + o;
            for (int32_t j = 1; j <= g.J; ++j)
                if (source[j] >= 1 && mark[o + j] != 0) point(o + j, j, k);
        }
    }
}

}  // namespace

void ExtrapolateSurfaceElevationX(float* xiExt) { Extrapolate(1, xiExt); }
void ExtrapolateSurfaceElevationY(float* xiExt) { Extrapolate(2, xiExt); }

void PrepareTimeLoop() {
    InitTiming(gLoop.timing, "2D Wave Simulation", 4);
    AddTiming(gLoop.timing, kTaskXSweep, "X-sweep");
    AddTiming(gLoop.timing, kTaskYSweep, "Y-sweep");
    AddTiming(gLoop.timing, kTaskOtherCalculation, "Other calculation");
    AddTiming(gLoop.timing, kTaskSimulationTotal, "Total");
    MakeChains();
    if (gRun.debugLevel == 3) WriteChainTables();
    CountWaterPoints(gChains.activePoints);
    SetupSweepBuffers();
    if (gEquation.gridScaleFilter > 0.0f) SetupGridScaleFilter();
    if (gRollers.type == 1) PrepareBreaking();
    gLoop.lineOrderFlag = true;
}

void ComputeStep(int32_t n) {
    gLoop.currentStep = n;
    TsReadStep(n);
    UpdateBoundaryData(n);
    if (gEddy.eddyType == 2) CalcEddyViscosity();
    HalfStep(1, n);
    HalfStep(2, n);
    if (gEquation.gridScaleFilter > 0.0f) {
        CalcGridScaleFilter();
        CalculateDepth(gGrid.J, gGrid.K, gGrid.depth.data(), gGrid.bed.data(), gGrid.xi.data());
    }
}

void CloseOutputs() {
    CloseOutputDeterministic();
    if (gStatisticOutput.type > 0) CloseOutputStatistic();
    if (gDisturbanceOutput.type > 0) CloseOutputDisturbance();
}

void CheckStateFinite() {
    const GridState& g = gGrid;
    const size_t stride = static_cast<size_t>(g.J) + 1;
    // The sweeps stop at a depth that is not a number; a flux can still hold
    // one after the last step, before any sweep has met it.
    for (const std::vector<float>* field : {&g.xi, &g.P, &g.Q}) {
        const float* v = field->data();
        for (size_t p = 0; p < field->size(); ++p) {
            if (std::isfinite(v[p])) continue;
            const auto j = static_cast<int32_t>(p % stride), k = static_cast<int32_t>(p / stride);
            const char* name = field == &g.xi ? "Surface" : field == &g.P ? "P flux" : "Q flux";
            BlowUp(std::string(name) + " is not a finite number, near (%,%)", j, k);
        }
    }
}

void Compute(int& exitCode) {
    GridState& g = gGrid;
    StartTiming(gOverallTiming, kTaskPreProcessing);
    exitCode = 0;

    PrepareTimeLoop();
    CreateOutputDeterministic();
    const bool statistics = gStatisticOutput.type > 0;
    const bool disturbance = gDisturbanceOutput.type > 0;
    if (statistics) {
        InitOutputStatistic();
        CreateOutputStatistic();
        WriteOutputStatistic(0);
    }
    if (disturbance) {
        InitOutputDisturbance();
        CreateOutputDisturbance();
        WriteOutputDisturbance(0);
    }
    if (gHotstartOutput.hotStart) WriteOutputHotstart(0);
    StartProgress(1, g.timeStepCount, exitCode);
    if (exitCode < 0) {
        StopTiming(gOverallTiming, kTaskPreProcessing);
        return;
    }
    WriteLine("");
    StopTiming(gOverallTiming, kTaskPreProcessing);

    gLoop.lineOrderFlag = true;
    gLoop.pointSteps = 0.0;
    gLoop.stepsDone = 0;
    StartLoopTasks();
    for (int32_t n = 1; n <= g.timeStepCount; ++n) {
        gLoop.pointSteps += gChains.activePoints;
        gLoop.stepsDone += 1;
        if (n % 100 == 0) WriteLine(Filled("Time step: %", n));
        ComputeStep(n);

        StopLoopTasks();
        StartTiming(gOverallTiming, kTaskPostProcessing);
        if (disturbance) {
            UpdateOutputDisturbance(n);
            WriteOutputDisturbance(n);
        }
        if (statistics && gStatisticOutput.numberOfRecords > 0) {
            UpdateOutputStatistic(n);
            WriteOutputStatistic(n);
        }
        WriteOutputDeterministic(n);
        if (gHotstartOutput.hotStart) WriteOutputHotstart(n);
        StopTiming(gOverallTiming, kTaskPostProcessing);
        StartLoopTasks();

        gLoop.lineOrderFlag = !gLoop.lineOrderFlag;
        ReportProgress(n, gChains.activePoints, exitCode);
        if (exitCode < 0) break;
    }
    StopLoopTasks();

    StartTiming(gOverallTiming, kTaskPostProcessing);
    CheckStateFinite();
    WriteLine("");
    CloseOutputs();
    WriteTimingReport(gLoop.timing);
    WriteRunStatistics(gOverallTiming, gLoop.stepsDone, gChains.activePoints,
                       static_cast<int64_t>(gLoop.pointSteps));
    StopTiming(gOverallTiming, kTaskPostProcessing);
}
