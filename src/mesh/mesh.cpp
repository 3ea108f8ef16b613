#include "mesh/mesh.hpp"

#include <cmath>
#include <map>
#include <new>
#include <stdexcept>
#include <string>

#include "mesh/shape.hpp"
#include "run/messages.hpp"

MeshTable gMeshes;

void ResetMeshModel() {
    gMeshes = MeshTable{};
    gShapes = ShapeTable{};
}

void AllocateMesh(Mesh& mesh, int32_t n, int32_t m, int32_t nodesPerElement, const char* context) {
    try {
        const size_t nodes = static_cast<size_t>(n) + 1;
        const size_t elements = static_cast<size_t>(m) + 1;
        mesh.NodeCount = n;
        mesh.x.assign(nodes, 0.0);
        mesh.y.assign(nodes, 0.0);
        mesh.z.assign(nodes, 0.0);
        mesh.code.assign(nodes, 0);
        mesh.ElementCount = m;
        mesh.ElementType.assign(elements, 0);
        mesh.ElementActive.assign(elements, 1);
        mesh.ElementShape.assign(elements, 0);
        mesh.ElementLength.assign(elements, 0.0);
        mesh.ElementStart.assign(elements + 1, 0);
        mesh.ElementNodes.assign(static_cast<size_t>(m) * nodesPerElement + 1, 0);
    } catch (const std::bad_alloc&) {
        StopRun(std::string(context) + ": Out of memory");
    } catch (const std::length_error&) {
        StopRun(std::string(context) + ": Out of memory");
    }
    for (int32_t e = 1; e <= m + 1; ++e) mesh.ElementStart[e] = (e - 1) * nodesPerElement + 1;
}

void MakeLineElements(Mesh& line) {
    for (int32_t e = 1; e <= line.ElementCount; ++e) {
        line.ElementType[e] = kLinearLine;
        line.ElementNodes[line.ElementStart[e]] = e;
        line.ElementNodes[line.ElementStart[e] + 1] = e + 1;
    }
}

void RefineMesh(const Mesh& line, Mesh& refined) {
    const int32_t n = line.NodeCount;
    const int32_t nodes = n > 0 ? 2 * n - 1 : 0;
    refined = Mesh{};
    AllocateMesh(refined, nodes, line.ElementCount, 3, "RefineMesh");
    refined.projection = line.projection;
    refined.dimension = 1;
    for (int32_t i = 1; i <= n; ++i) {
        const int32_t k = 2 * i - 1;
        refined.x[k] = line.x[i];
        refined.y[k] = line.y[i];
        refined.z[k] = line.z[i];
        refined.code[k] = line.code[i];
        if (i < n) {
            refined.x[k + 1] = 0.5 * (line.x[i] + line.x[i + 1]);
            refined.y[k + 1] = 0.5 * (line.y[i] + line.y[i + 1]);
            refined.z[k + 1] = 0.5 * (line.z[i] + line.z[i + 1]);
        }
    }
    // Left, right, middle: the nodes of an element lie within 2 of each other.
    for (int32_t e = 1; e <= refined.ElementCount; ++e) {
        refined.ElementType[e] = kQuadraticLine;
        const int32_t start = refined.ElementStart[e];
        refined.ElementNodes[start] = 2 * e - 1;
        refined.ElementNodes[start + 1] = 2 * e + 1;
        refined.ElementNodes[start + 2] = 2 * e;
    }
}

void SetupMeshTopology(Mesh& mesh) {
    for (int32_t e = 1; e <= mesh.ElementCount; ++e) {
        mesh.ElementShape[e] = SetupShapeData(mesh.ElementType[e]);
        const int32_t a = GetElementNode(mesh, e, 1), b = GetElementNode(mesh, e, 2);
        mesh.ElementLength[e] = std::hypot(mesh.x[b] - mesh.x[a], mesh.y[b] - mesh.y[a]);
    }
    // Code 0 marks an inner node and has no section.
    std::map<int32_t, std::vector<int32_t>> byCode;
    for (int32_t i = 1; i <= mesh.NodeCount; ++i)
        if (mesh.code[i] != 0) byCode[mesh.code[i]].push_back(i);
    mesh.CodeSections.clear();
    for (auto& [code, nodes] : byCode) mesh.CodeSections.push_back({code, std::move(nodes)});
}
