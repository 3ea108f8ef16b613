// What the sweeps do before they start and when they must stop: the
// boundary values in the extrapolated surface, the coefficient buffers, and
// the blow-up stop.
#include <omp.h>

#include <algorithm>
#include <cstdlib>
#include <new>

#include "output/deterministic.hpp"
#include "processes/friction.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/rollers.hpp"
#include "run/messages.hpp"
#include "run/process.hpp"
#include "run/run_sequence.hpp"
#include "run/run_state.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/sweep_rows.hpp"
#include "solver2d/sweeps.hpp"
#include "solver2d/time_loop.hpp"

SweepBuffers gSweepBuffers;

size_t SweepBuffers::Slice(int32_t line, int32_t n) const {
    return gLoop.lineBufferMode == 1 ? 0 : static_cast<size_t>(line) * (static_cast<size_t>(n) + 1);
}

namespace {

int32_t TableRow(int32_t b, int32_t j, int32_t k) {
    const BoundaryRecord& r = Boundary(b);
    return (r.orientation == 1 || r.orientation == 3) ? k - r.first[1] : j - r.first[0];
}

// The ends of the chains of one direction; axis 1 walks the x chains with
// codeY at their ends, axis 2 the y chains with codeX.
void SetChainEnds(int32_t chainAxis, int32_t levelColumn, int32_t gradientColumn, float* xiExt) {
    const GridState& g = gGrid;
    const bool x = chainAxis == 1;
    const int32_t lines = x ? g.K : g.J;
    const size_t along = x ? 1 : g.Stride();
    const int32_t* code = x ? gChains.codeY.data() : gChains.codeX.data();
    const float ds = x ? g.dx : g.dy;
    const bool deep = gEquation.deepWaterTerms;
    for (int32_t l = 0; l <= lines; ++l) {
        const int32_t count = x ? gChains.chainCountX[l] : gChains.chainCountY[l];
        for (int32_t c = 1; c <= count; ++c) {
            const ChainPair& ch = x ? gChains.X(l, c) : gChains.Y(l, c);
            const size_t pf = x ? g.At(ch.first, l) : g.At(l, ch.first);
            const size_t pl = x ? g.At(ch.last, l) : g.At(l, ch.last);
            auto value = [&](int32_t i, int32_t column) {
                const int32_t j = x ? i : l, k = x ? l : i;
                const int32_t b = FindBoundary(j, k, chainAxis);
                if (b == 0) BlowUp("Undefined open boundary point, near (%,%)", j, k);
                return BoundaryValues(b).Value(TableRow(b, j, k), column);
            };
            if (ch.first == ch.last) {
                if (code[pf] == kCodeLevelBoundary) xiExt[pf] = value(ch.first, levelColumn);
                continue;
            }
            if (code[pf] == kCodeLevelBoundary) xiExt[pf] = value(ch.first, levelColumn);
            if (code[pl] == kCodeLevelBoundary) xiExt[pl] = value(ch.last, levelColumn);
            if (deep) {
                if (code[pf] == kCodeFluxBoundary)
                    xiExt[pf] = xiExt[pf + along] - ds * value(ch.first, gradientColumn);
                if (code[pl] == kCodeFluxBoundary)
                    xiExt[pl] = ds * value(ch.last, gradientColumn) + xiExt[pl - along];
            } else {
                xiExt[pf] = xiExt[pf + along];
                xiExt[pl] = xiExt[pl - along];
            }
        }
    }
}

}  // namespace

void SetBoundarySurface(int32_t axis, float* xiExt) {
    const int32_t level = axis == 1 ? 2 : 1, gradient = axis == 1 ? 6 : 5;
    SetChainEnds(1, level, gradient, xiExt);
    SetChainEnds(2, level, gradient, xiExt);
}

void SetupSweepBuffers() {
    const GridState& g = gGrid;
    const int32_t threads = std::max(1, gProcess.threadCount);
    const bool eddy = gEddy.eddyType == 1 || gEddy.eddyType == 2;
    const bool breaking = gRollers.type > 0;
    if (gEquation.convectiveHandle == 0) {
        const bool single = threads == 1 && !breaking && !eddy;
        gLoop.sweepMode = single ? 1 : 2;
        gLoop.lineBufferMode = single ? 1 : 2;
    } else {
        gLoop.sweepMode = eddy ? 2 : 1;
        gLoop.lineBufferMode = (eddy || threads != 1) ? 2 : 1;
    }
    SweepBuffers& sb = gSweepBuffers;
    sb.count = gEquation.convectiveHandle == 0 ? 8 : 12;
    sb.lineLength = static_cast<size_t>(std::max(g.J, g.K)) + 1;
    const size_t length = gLoop.lineBufferMode == 1 ? sb.lineLength : g.Points();
    try {
        for (int i = 0; i < kBufferCount; ++i)
            sb.buffer[i].assign(i < sb.count ? length : 0, 0.0f);
        sb.rows.assign(threads, ChainRows{});
        for (ChainRows& w : sb.rows) w.Reserve(static_cast<int32_t>(sb.lineLength) + 2);
        for (auto* r : {&sb.A, &sb.C, &sb.E, &sb.F}) r->assign(sb.lineLength + 3, 0.0f);
        if (std::abs(gEquation.convectiveHandle) == 2) {
            const size_t rows = 2 * sb.lineLength + 3;
            sb.band.assign(static_cast<size_t>(threads) * 13 * rows, 0.0f);
            sb.rhs.assign(static_cast<size_t>(threads) * rows, 0.0f);
            sb.pivots.assign(static_cast<size_t>(threads) * rows, 0);
        }
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    CopyStaticColumns();
}

void BlowUp(const std::string& text, int32_t i, int32_t j) {
#pragma omp critical(bw_blow_up)
    {
        std::string message = text;
        FillPercent(message, message, i);
        FillPercent(message, message, j);
        WriteLine("---------- B L O W  -  U P  detected ---");
        WriteLine(message);
        WriteLine(Filled("in time step %", gLoop.currentStep));
        WriteLine("");
        WriteLine("COMPUTATION ENDED");
        CloseOutputs();
        Shutdown(gRun.parameterFileName, kExitAbnormal);
    }
    std::abort();  // not reached: the shutdown ends the process
}
