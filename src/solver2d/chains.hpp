// Grid codes and chains. A chain is a maximal run of water points in one grid
// line; each is one independent system of a sweep. The codes tell a sweep
// what lies beside a point across its line (codeX: north and south, read by
// the x-sweep; codeY: east and west) and mark the points of open boundaries.
//
//   4 water on both sides   3 land at +1   2 land at -1   1 land on both sides
//   6 level boundary        7 flux boundary
//  -1 land                 -2 land whose +1 neighbour is land too
#pragma once

#include <cstdint>

constexpr int32_t kCodeLevelBoundary = 6;
constexpr int32_t kCodeFluxBoundary = 7;

// Builds the codes and chains from the depths (slot off) or the bed (slot
// on), cuts the fluxes at land and marks the open boundaries.
void MakeChains();
// The number of points whose codeX is 1 or more.
void CountWaterPoints(int32_t& count);
// The tables in the log (debug level 3).
void WriteChainTables();
// The number (from 1) of the first boundary record that holds (j,k): axis 1
// searches the west and east records, axis 2 the north and south ones; 0 if none.
int32_t FindBoundary(int32_t j, int32_t k, int32_t axis);
