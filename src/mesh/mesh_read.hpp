// Reading a mesh from its file. The mesh of a 1DH run is the bathymetry
// itself, a 1D data file: its points are the nodes of a line of linear
// elements, and its bed levels their z.
#pragma once

#include <string>

#include "mesh/mesh.hpp"

// Chooses the reader by the extension of the file name: "xol1" or "dt1"
// (in any case) is a 1D data file; no other kind can be named.
void ReadMesh(const std::string& path, Mesh& mesh);

// A 1D data file as a line: with one item the nodes lie dx apart from x = 0
// (dx the spacing of the axis) and the item is z; with two items the first is
// x and the second z. The two end nodes get code 2, and an end on dry land
// (z > 0) takes the z of its neighbour, so that an open end stands in water.
void ReadMeshBasicXol1(const std::string& path, Mesh& mesh);
