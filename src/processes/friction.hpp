// Bottom friction and eddy viscosity: the two closures of the momentum
// equations. Friction is a quadratic drag with a Chezy or Manning number;
// eddy viscosity a horizontal diffusion of the fluxes, prescribed or from the
// strain of the flow (Smagorinsky type). The sweeps apply both.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/kvt/kvt.hpp"

struct FrictionSettings {
    int32_t resistanceType = 0;  // 0 none, 1 one value, 2 a map
    int32_t formulation = 0;     // 1 Chezy, any other Manning
    float constantValue = 0.0f;
    float frictionConstant = 0.0f;    // 9.81/M^2 with resistanceType 1
    std::vector<float> frictionCoef;  // 9.81/M^2 over the grid with resistanceType 2
    std::string fileName;
    int32_t itemCount = 0;
    int32_t itemNumbers[3] = {0, 0, 0};
};
extern FrictionSettings gFriction;

struct EddySettings {
    int32_t type = 0;         // Type: 0 off, 1 one value, 2 a map
    int32_t formulation = 0;  // 0 prescribed, 1 Smagorinsky type
    int32_t base = 0;         // 0: the 2DH sweeps act as if off
    float constantValue = 0.0f;
    int32_t eddyType = 0;  // 0 off; formulation + 1, negative with base 0
    std::vector<float> eddyViscosity;    // over the grid
    std::vector<float> smagorinskyCoef;  // with formulation 1
    std::string fileName;
    int32_t itemCount = 0;
    int32_t itemNumbers[3] = {0, 0, 0};
};
extern EddySettings gEddy;

void SetupBottomFriction(KvtHandle target);
void SetupEddyViscosity(KvtHandle target);
// The Smagorinsky field from the strain of the flow, once a step before the
// x-sweep with eddyType 2; stored divided by the depth.
void CalcEddyViscosity();
// The friction coefficient F at point (j,k): 0, the constant or the map's value.
inline float FrictionCoefficientAt(size_t point) {
    if (gFriction.resistanceType == 1) return gFriction.frictionConstant;
    if (gFriction.resistanceType == 2) return gFriction.frictionCoef[point];
    return 0.0f;
}
