// The hand-over from the model reader to the mesh solver of a 1DH run. The
// mesh solver never reads the model file: the reader, as its last act,
// writes a second parameter file beside it, "<model file>_FEM.kvt", in which
// every setting is recast in the solver's own vocabulary. That file stays on
// disk after the run.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/kvt/kvt.hpp"

constexpr const char* kMeshSolverTarget = "MeshSolverBW";

// The path of the second file: the model file's name with its extension,
// directly followed by "_FEM.kvt".
std::string MeshSolverFileName(const std::string& modelName);

// The two node codes that the file lays over the mesh, whose reader gives
// code 2 to the first and the last node and 0 to all others. With neither a
// boundary inside the line nor a generation record the codes of the mesh's
// own ends are repeated, which leaves them as they are.
struct NodeCodes {
    int32_t nodes[2] = {0, 0};  // 1-based node numbers
    int32_t codes[2] = {0, 0};
};
NodeCodes MeshNodeCodes();

// The positions of the bathymetry's points along the line: index x dx on an
// equidistant line; with a bathymetry of two items (positions, then levels)
// the values of the first item.
struct LinePositions {
    bool equidistant = true;
    float dx = 0.0f;
    std::vector<float> table;  // one a point with equidistant false
    float At(int32_t index) const {
        return equidistant ? static_cast<float>(index) * dx : table[static_cast<size_t>(index)];
    }
};
LinePositions ReadLinePositions();

// Builds the second file from the model settings read, writes it beside
// the model file modelName and closes it; outPath gets the path written,
// which the run driver opens.
void WriteMeshSolverFile(const std::string& modelName, std::string& outPath);
