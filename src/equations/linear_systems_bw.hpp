// The three banded systems of the 1DH Boussinesq equations, in the order
// flux, elevation, auxiliary: the flux matrix on the quadratic velocity mesh
// (kl = ku = 2, since the three nodes of a quadratic element lie within 2 of
// each other), the elevation and the auxiliary matrix on the linear meshes
// (kl = ku = 1, neighbours only), and two work vectors of the state size.
#pragma once

#include <cstdint>
#include <vector>

#include "equations/band_matrix.hpp"

struct LinearSystemsBW {
    LinearSystem FluxMatrix, ElevationMatrix, AuxMatrix;
    int32_t StateSize = 0;             // velocity nodes + elevation nodes
    std::vector<double> work1, work2;  // 1..StateSize, slot 0 unused
};

// Makes the three systems for meshes of the given node counts and the work
// vectors of velocityNodes + elevationNodes entries. The systems must not
// have been made before.
void SetupLesBW(LinearSystemsBW& les, int32_t velocityNodes, int32_t elevationNodes,
                int32_t auxNodes);
