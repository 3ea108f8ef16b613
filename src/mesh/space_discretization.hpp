// The DOMAIN section of the mesh solver's parameter file: which meshes the
// run has, read from their files and laid over with codes, the quadratic mesh
// made from the line, the Gauss rule of the shapes, and the block "Mesh
// information" of each mesh in the log.
#pragma once

#include <cstdint>

#include "mesh/mesh.hpp"

// Reads DOMAIN through the current-section face of the parameter access
// layer: the caller has made the solver file's target current. dimensions,
// the run's number of horizontal dimensions, is not needed to read a line:
// each mesh states its own dimension. DOMAIN's number_of_dimensions is echoed
// and kept in the table.
void SetupSpaceDiscretization(int32_t dimensions);

// Subtracts the datum from every z, lifts a boundary node whose z lies above
// minimumDepth and not above thresholdDepth to minimumDepth, then lays the
// listed codes over the nodes, in the order of the lists. Node numbers
// outside the mesh are passed over.
void TreatMesh(Mesh& mesh, double datumDepth, double minimumDepth, double thresholdDepth,
               const int32_t* nodes, const int32_t* codes, int32_t count);

// Mesh 2 of the table becomes the quadratic refinement of the line of mesh
// 1, with its element shapes, lengths and code sections.
void AddQuadraticMesh();

// The block "Mesh information" of one mesh.
void WriteMeshInformation(const Mesh& mesh);
