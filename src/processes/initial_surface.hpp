// The starting state of the 2DH model: a cold start from one level or a map
// of the surface, or a hot start from the state file of an earlier run.
#pragma once

#include <cstdint>
#include <string>

#include "platform/kvt/kvt.hpp"

// SURFACE_ELEVATION of a cold start.
struct InitialSurfaceSettings {
    int32_t surfaceType = 0;     // 0 one level everywhere; any other value a map
    float constantValue = 0.0f;  // the level of surfaceType 0
    std::string fileName;        // the map of any other type
    int32_t item = 0;
};
extern InitialSurfaceSettings gInitialSurface;

// Reads SURFACE_ELEVATION (cold start) or the state items of the hot-start
// file, and sets depth from the surface. Nothing with one dimension.
void SetupInitialSurface(KvtHandle target);
