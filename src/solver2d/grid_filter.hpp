// The grid-scale filter of the scheme (Grid_scale_filter of
// SOLUTION_PARAMETERS, 0 = off). At the end of each step every stored time
// level of the surface and of the fluxes loses c/16 of its fourth
// differences along x and along y, c the coefficient:
//
//   F := F - c/16 (dxxxx F + dyyyy F)   for xi, xiPrev, P, PPrev, Q, QPrev, qxyt
//
// All levels are filtered alike, so that the time differences the sweeps
// form from them are filtered the same way and a mode of the linear scheme
// on a flat bed is only multiplied by 1 - c (sin^4(a/2) + sin^4(b/2)),
// a = kx dx, b = ky dy. That takes 2c off the checkerboard mode of the grid
// every step and about c (kx dx)^4/16 off a resolved wave, so it stops the
// growth of the shortest waves that the time extrapolation of the
// dispersive terms brings on fine grids (docs/numerics.md) at a loss of a
// resolved wave far below the damping of a lower extrapolation factor.
//
// Differences run along the chains. At land the surface is mirrored (no
// flux through the coast, so the volume of a chain is kept), the flux
// normal to the coast is odd about the closed face, the flux along it is
// mirrored; beyond an open boundary every field goes on evenly. The points
// of an open boundary and the faces beside them keep what the boundary
// gives, and so do points within two of an internal generation source, so
// that a wave is not smoothed at its birth. With the moving shoreline the
// filter works only where the surface stands at or above the bed: the slot
// is left alone and the surface mirrored at the waterline.
#pragma once

#include <cstdint>
#include <vector>

#include "solver2d/model_state.hpp"

struct GridFilterState {
    // Per point: the neighbours the stencil may use and whether the point
    // (or the face east or north of it) is filtered; see grid_filter.cpp.
    std::vector<uint8_t> point, faceX, faceY;
    // Per point, made with the first tables: 1 where the filter leaves the
    // point alone whatever the waterline does (open boundaries, sources).
    std::vector<uint8_t> kept;
    std::vector<uint8_t> water;  // 1 at the points the filter works on, renewed by each setup
    Field lapX, lapY;  // second differences of the field being filtered
};
extern GridFilterState gGridFilter;

// The neighbour tables from the chains' codes (after MakeChains) and, with
// the moving shoreline, from the present waterline; the work fields.
void SetupGridScaleFilter();
// Filters the stored levels; called after the y half of a step when the
// coefficient is above 0. Parallel over rows.
void CalcGridScaleFilter();
