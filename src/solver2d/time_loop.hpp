// The driver of the 2DH solver. One time step is an x-sweep and a y-sweep of
// an alternating-direction implicit scheme; each advances the surface by half
// a step and its own flux by a whole step. At the start of step n (m = n-1):
//
//   xi  t(m)      xiPrev  t(m-1/2)   xiPrev2  t(m-1)
//   P   t(m)      PPrev   t(m-1)     Q  t(m+1/2)   QPrev  t(m-1/2)
//
// The x-sweep brings xi to t(m+1/2) and P to t(m+1), the y-sweep xi to t(m+1)
// and Q to t(m+3/2). Extrapolated surfaces xiExtX (t(m+1/2)) and xiExtY
// (t(m+1)) and their depths centre the nonlinear terms without iteration.
// With Grid_scale_filter above 0 the stored levels are filtered at the end
// of the step (grid_filter.hpp).
#pragma once

#include <cstdint>

#include "run/timing.hpp"

struct TimeLoopState {
    bool lineOrderFlag = true;  // true: lines from the top index down
    int32_t sweepMode = 1;      // 1 assemble and solve each line at once; 2 assemble all first
    int32_t lineBufferMode = 1;  // 1 one slice for all lines; 2 a slice per line
    TimingGroup timing;          // "2D Wave Simulation"
    double pointSteps = 0.0;     // sum of active points over the steps
    int32_t stepsDone = 0;
    int32_t currentStep = 0;
};
extern TimeLoopState gLoop;

// The whole 2DH run: chains, outputs, the time steps, closing.
void Compute(int& exitCode);
// Before the first step: the chains, the count of active points and the
// sweep buffers (the first acts of Compute, for tests that drive the loop).
void PrepareTimeLoop();
// Closes the outputs that are on: deterministic, statistics, disturbance.
void CloseOutputs();
// A blow-up at the first surface level or flux that is not a finite number.
void CheckStateFinite();
// The computing of time step n: the row of the series, the boundary data,
// the x half and the y half. The caller writes output and turns the line order.
void ComputeStep(int32_t n);
// target = surface - bed at all points, then the slot correction. Parallel over k.
void CalculateDepth(int32_t J, int32_t K, float* target, const float* bed, const float* surface);
void ExtrapolateSurfaceElevationX(float* xiExt);
void ExtrapolateSurfaceElevationY(float* xiExt);
// xiPrev2 := xiPrev, xiPrev := xi. Parallel over k.
void ShiftSurfaceLevels();
