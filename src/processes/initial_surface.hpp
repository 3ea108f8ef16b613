// The starting state of the 2DH model: a cold start from one level or a map
// of the surface, or a hot start from the state file of an earlier run.
#pragma once

#include "platform/kvt/kvt.hpp"

// Reads SURFACE_ELEVATION (cold start) or the state items of the hot-start
// file, and sets depth from the surface.
void SetupInitialSurface(KvtHandle target);
