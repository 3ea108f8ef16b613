// The 1DH table of bwbench: the mesh solver stepping a flat and a sloping
// flume of 2000 and 20 000 surface nodes (or of `onlyNodes`), on one core,
// for about scale x 2e7 nodes x steps each.
#pragma once

#include <cstdint>

void FlumeTable(double scale, int32_t onlyNodes);
