// Wave breaking by surface rollers: where the surface rises faster than a
// critical slope allows, the excess becomes a roller of thickness delta that
// travels with celerity (cx, cy) and feeds the momentum equations with an
// extra flux of momentum. The slope relaxes from an initial to a final value
// while a point keeps breaking.
#pragma once

#include <cstdint>
#include <vector>

#include "platform/kvt/kvt.hpp"

struct RollerSettings {
    int32_t type = 0;  // 1: rollers on; any other value: no further key, no field
    double rollerFactor = 2.0;
    int32_t velocityType = 1;
    double velocityFactor = 1.3;
    double velocityEps = 0.001;
    double minimumDepth = 0.05;
    double initialAngle = 20.0;  // degrees as read; the 2DH setup keeps tan of it in tanInitial
    double finalAngle = 10.0;
    double halfTime = 1.0;
    double direction = 0.0;       // degrees, default orientation + 270
    double breakDirection = 0.0;  // radians along the grid's x axis
    double tanInitial = 0.0, tanFinal = 0.0;
    std::vector<float> tanPhi, tanPhiOld, delta, deltaOld, cx, cxOld, cy, cyOld;
    // Where no roller may stand, whatever the surface does: kPorousOrSponge
    // (no celerity, no thickness) and kSource (no thickness); PrepareBreaking.
    std::vector<uint8_t> blocked;
};
constexpr uint8_t kPorousOrSponge = 1, kSource = 2;
extern RollerSettings gRollers;

void SetupWaveBreaking(KvtHandle target);
// Renews the roller fields before each sweep: axis 1 before the x-sweep, 2
// before the y-sweep, after the depth of the estimated surface and before
// the shift of the surface levels, so that xi is the level just reached,
// xiPrev half a step and xiPrev2 a whole step older. xiExt is not used.
void CalcBreaking(const float* xiExt, int32_t axis);
// The map of the points where no roller may stand (porosity, sponge, sources
// of internal generation), before the first step; CalcBreaking makes it
// itself if it is missing.
void PrepareBreaking();
