// Moving shoreline by the slot technique: every beach point keeps a narrow,
// deep slot in its bed, so that it stays wet when the surface sinks below the
// bed. The slot gives the continuity equation a storage width c (the fraction
// of the cell's area that stores water at the present level) and every depth
// of the run the cross-section of slot and bed together.
#pragma once

#include <cstdint>
#include <vector>

#include "platform/kvt/kvt.hpp"

struct ShorelineSettings {
    int32_t type = 0;              // above 0: the slot is on
    double slotDepth = -10.0;      // level of the slot's bottom, in the frame of bed
    double width = 0.01;           // w: relative width at the slot's bottom
    double lambda = 100.0;         // smoothing_parameter: shape of the transition
    double frictionCoefficient = 0.0;  // handed to the mesh solver only
    double maxDepth = 999.0;       // slotMaxDepth
    std::vector<float> outflowFactor;  // LimitOutflow's work field
};
extern ShorelineSettings gShoreline;

// Reads MOVING_SHORELINE; the keys behind type only when type is 1.
void SetupMovingShoreline(KvtHandle target);
// The storage width at a point of still depth d = -bed with the given surface.
double StorageWidth(double surface, double d, double slotDepth, double maxDepth, double width,
                    double lambda);
// The storage width at point (j,k) with the given surface, 1 with the slot off.
float StorageWidthAt(int32_t j, int32_t k, float surface);
// Replaces the plain depth target = surface - bed by the slot's cross-section
// at every point below the land value. Parallel over rows.
void SlotCorrection(float* target, const float* bed);
// After the sweep of the axis (1: P, 2: Q): no point may send out through
// that flux, over the half step in which the other sweep holds it, more
// than a quarter of the water standing above its bed; a point in the slot
// sends none. The faces out of such a point are scaled down, each face by
// the point upstream of it, so that water is conserved. Away from the
// waterline a flux would need a Courant number above 1/4 to be touched.
void LimitOutflow(int32_t axis);
