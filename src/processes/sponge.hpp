// Sponge layers and the explicit filter: two ways of taking energy out of the
// solution after each sweep. A sponge of coefficient s divides a point's
// deviation from the rest state by s; the filter smooths the grid-scale
// oscillations with a five-point Jacobi stencil along the chains.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/kvt/kvt.hpp"

struct SpongeSettings {
    bool spongeType = false;
    std::string fileName;
    int32_t itemCount = 0;
    int32_t itemNumbers[3] = {0, 0, 0};
    std::vector<float> sponge;  // 1: no damping; s divides the deviation by s each sweep
};
extern SpongeSettings gSponge;

struct FilterSettings {
    int32_t type = 0;  // 0 off, 1 one coefficient, 2 a map
    float filterCoeff = 0.2f;
    std::string fileName;
    int32_t itemCount = 0;
    int32_t itemNumbers[3] = {0, 0, 0};
    std::vector<float> filterCoef;  // over the grid
};
extern FilterSettings gFilter;

void SetupSpongeLayer(KvtHandle target);
void SetupExplicitFilter(KvtHandle target);
// Damps xi, P, Q, PPrev and QPrev towards the references of OPTION_PARAMETERS
// at every water point whose coefficient is not 1. Parallel over columns.
void AbsorpWaveEnergy();
// The filter after the x-sweep (P, then xi, along the x chains) and after the
// y-sweep (Q, then xi, along the y chains).
void CalcFilterX();
void CalcFilterY();
