// The line meshes of the mesh solver: nodes with their coordinates and
// boundary codes, elements in compressed rows, the length of each element and
// the sections of nodes that share a code. Mesh 1 is the line read from the
// bathymetry with linear elements (type 11); mesh 2 is its refinement with
// quadratic elements (type 12), numbered so that the nodes of an element lie
// within 2 of each other and the band of the flux matrix stays narrow.
//
// Index convention: everything indexed by a node or an element number is a
// std::vector with an unused slot 0, so that x[i] is node i and
// ElementType[e] is element e, for i = 1..NodeCount and e = 1..ElementCount.
// The meshes of the table are meshes[1..number_of_meshes]. Plain lists
// (CodeSections, the nodes of a section) are ordinary 0-based lists of
// 1-based node numbers.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

constexpr int32_t kMaxMeshes = 4;
constexpr int32_t kLinearLine = 11;     // element type: line of 2 nodes
constexpr int32_t kQuadraticLine = 12;  // element type: line of 3 nodes (left, right, middle)

// The nodes of one code value, in ascending node order.
struct CodeSection {
    int32_t code = 0;
    std::vector<int32_t> nodes;
};

struct Mesh {
    int32_t id = 0;  // its index in the table
    std::string projection;
    int32_t dimension = 0;
    int32_t NodeCount = 0;
    std::vector<double> x, y, z;  // z: bed level, negative below the datum
    std::vector<int32_t> code;    // 0 for an inner node
    int32_t ElementCount = 0;
    std::vector<int32_t> ElementType;
    std::vector<int32_t> ElementActive;  // 0 switches an element off
    std::vector<int32_t> ElementShape;   // index into the shape table
    // The nodes of element e are ElementNodes[ElementStart[e] .. ElementStart[e + 1] - 1].
    std::vector<int32_t> ElementStart, ElementNodes;
    std::vector<double> ElementLength;
    std::vector<CodeSection> CodeSections;  // one per nonzero code present, ascending
};

struct MeshTable {
    int32_t number_of_meshes = 0;
    int32_t number_of_dimensions = 0;  // as the DOMAIN section states it
    Mesh meshes[kMaxMeshes + 1];       // meshes[1..number_of_meshes]
};
extern MeshTable gMeshes;

// Empties the mesh table and the shape table.
void ResetMeshModel();

inline int32_t GetElementNodeCount(const Mesh& mesh, int32_t e) {
    return mesh.ElementStart[e + 1] - mesh.ElementStart[e];
}
// Node number of local node k (1-based) of element e.
inline int32_t GetElementNode(const Mesh& mesh, int32_t e, int32_t k) {
    return mesh.ElementNodes[mesh.ElementStart[e] + k - 1];
}

// Sizes the node arrays for n nodes and the element arrays for m elements of
// nodesPerElement nodes each, all active, in compressed rows.
void AllocateMesh(Mesh& mesh, int32_t n, int32_t m, int32_t nodesPerElement, const char* context);

// The n - 1 linear elements of a line of n nodes (allocated for them):
// element e runs from node e to node e + 1.
void MakeLineElements(Mesh& line);

// The quadratic line made from a linear one: 2n - 1 nodes, the old node i
// becoming node 2i - 1 with its code, and a middle node 2i of code 0 between
// old nodes i and i + 1. Element e has the nodes 2e - 1, 2e + 1, 2e.
void RefineMesh(const Mesh& line, Mesh& refined);

// Element shapes (registered in the shape table), element lengths (the
// distance of the first two nodes) and the code sections.
void SetupMeshTopology(Mesh& mesh);
