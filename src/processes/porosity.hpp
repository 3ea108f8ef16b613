// Porosity: a map of the fraction n of the volume open to flow. n scales the
// storage of the continuity equation and the pressure and inertia terms of
// the momentum equations, and brings a linear (alpha) and a quadratic (beta)
// resistance of the grains into porous areas.
#pragma once

#include <string>
#include <vector>

#include "platform/kvt/kvt.hpp"

struct PorositySettings {
    bool porosityType = false;
    float particleCoef1 = 1000.0f, particleCoef2 = 2.8f, particleDiameter = 0.2f;
    float alpha = 0.0f;  // 1.4e-06 * Coef1 / Diameter^2
    float beta = 0.0f;   // Coef2 / Diameter
    bool noExtrapolation = false;  // dispersion: no time extrapolation in porous faces
    std::string fileName;
    int32_t itemCount = 0;
    int32_t itemNumbers[3] = {0, 0, 0};
    std::vector<float> porosity;  // n over the grid; 1 in open water
};
extern PorositySettings gPorosity;

void SetupPorosity(KvtHandle target);
