// How stable the 2DH scheme is at the settings of a run, from a linear
// analysis of the scheme as built. On a flat bed of depth h, with porosity 1
// and no slot, convection, friction, rollers, eddy viscosity or sources, and
// a surface small against h, the time loop is linear with constant
// coefficients: a mode exp(i (a j + b k)) of every field (a = kx dx,
// b = ky dy) is carried into the same mode by one step, multiplied by a 7 x 7
// amplification matrix over the stored levels
//   xi, xiPrev, P, PPrev, Q, QPrev, qxyt.
// The matrix follows the step term by term: the surface estimates, the shift
// of the levels, the momentum and continuity rows of both sweeps with their
// extrapolated time differences of the flux across, the deep-water terms on
// the estimated surface, and the grid-scale filter. Linearised, the central
// and the upwind sweeps are the same scheme. The largest modulus of its
// eigenvalues over the modes is the growth of the fastest mode in a step;
// above 1 the run is unstable, whatever the waves it is meant to carry.
// tools/bwscheme/scheme.py is the same analysis for the tables and plots of
// docs/numerics.md.
#pragma once

#include <cstdint>

struct SchemeCase {
    double h = 1.0;            // still water depth
    double dx = 1.0, dy = 1.0;
    double dt = 0.1;
    double fe = 1.0;           // extrapolation factor of the dispersive terms in force
    bool deep = false;         // Deep_Water_Terms
    double B = 0.0;            // dispersion factor (0 without the deep-water terms)
    double filter = 0.0;       // Grid_scale_filter
};

// The growth of the fastest mode in a step and the mode.
struct SchemeGrowth {
    double rate = 0.0;
    double a = 0.0, b = 0.0;
};

// The largest eigenvalue modulus of the mode (a, b).
double SpectralRadius(const SchemeCase& c, double a, double b);
// The largest over the modes a, b in (0, pi]: a grid of modes, then a finer
// look around the largest ones, so that narrow bands of growth are found.
SchemeGrowth LargestGrowth(const SchemeCase& c);
// Whether no mode grows (a rate of at most 1 + 1e-9).
bool SchemeStable(const SchemeCase& c);
// The largest step at or below c.dt at which no mode grows, by bisection
// (the stable steps of the scheme form one interval from 0).
double StableTimeStep(SchemeCase c);
// The smallest Grid_scale_filter up to 0.8 with which no mode grows at
// c.dt, or a negative number when 0.8 does not do.
double StableFilter(SchemeCase c);

// The block "Scheme stability" of the log: the Courant number in the
// deepest water, and, where a mode of the grid grows more than tenfold over
// the run at some depth of the model, a warning that names the growth, the
// depth and the settings that would be stable.
void ReportSchemeStability();
