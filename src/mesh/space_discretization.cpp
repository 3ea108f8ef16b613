#include "mesh/space_discretization.hpp"

#include <algorithm>
#include <string>
#include <vector>

#include "input/kvt_current.hpp"
#include "mesh/mesh_read.hpp"
#include "mesh/shape.hpp"
#include "run/messages.hpp"

namespace {

double LargestZ(const Mesh& mesh) {
    if (mesh.NodeCount < 1) return 0.0;
    return *std::max_element(mesh.z.begin() + 1, mesh.z.end());
}

// One mesh from its file, with the treatment of its levels and its codes.
void ReadOneMesh(Mesh& mesh, int32_t id) {
    std::string fileName;
    KvtGetFilename("file_name", fileName);
    ReadMesh(fileName, mesh);
    mesh.id = id;

    double datum = 0.0;
    KvtGetDouble("datum_depth", datum);
    // The clip defaults leave every level as it is.
    double minimum = LargestZ(mesh) - datum, threshold = minimum;
    KvtGetDouble("minimum_depth", minimum);
    KvtGetDouble("thresshold_depth", threshold);

    int32_t count = 0;
    std::vector<int32_t> nodes, codes;
    if (mesh.dimension == 1) {
        KvtGetInteger("number_of_nodes", count);
        count = std::max(count, 0);
        nodes.assign(static_cast<size_t>(count) + 1, 0);
        codes.assign(static_cast<size_t>(count) + 1, 0);
        if (count > 0) {
            KvtGetIntegerList("node_number_of_code", nodes.data(), count);
            KvtGetIntegerList("value_of_code", codes.data(), count);
        }
    }
    TreatMesh(mesh, datum, minimum, threshold, nodes.data(), codes.data(), count);
    SetupMeshTopology(mesh);
}

}  // namespace

void TreatMesh(Mesh& mesh, double datumDepth, double minimumDepth, double thresholdDepth,
               const int32_t* nodes, const int32_t* codes, int32_t count) {
    for (int32_t i = 1; i <= mesh.NodeCount; ++i) {
        mesh.z[i] -= datumDepth;
        if (mesh.code[i] > 0 && mesh.z[i] > minimumDepth && mesh.z[i] <= thresholdDepth)
            mesh.z[i] = minimumDepth;
    }
    for (int32_t k = 0; k < count; ++k)
        if (nodes[k] >= 1 && nodes[k] <= mesh.NodeCount) mesh.code[nodes[k]] = codes[k];
}

void SetupSpaceDiscretization(int32_t /*dimensions*/) {
    MeshTable& t = gMeshes;
    KvtOpenSection("DOMAIN");
    int32_t declared = 2, meshes = 1;
    KvtGetInteger("number_of_dimensions", declared);
    KvtGetInteger("number_of_meshes", meshes);
    if (meshes > kMaxMeshes) StopRun("SetupSpaceDiscretization: Too many meshes");
    t.number_of_dimensions = declared;
    t.number_of_meshes = std::max(meshes, 0);

    for (int32_t m = 1; m <= t.number_of_meshes; ++m) {
        if (t.number_of_meshes > 1) KvtOpenSection("Mesh", m);
        ReadOneMesh(t.meshes[m], m);
        if (t.number_of_meshes > 1) KvtCloseSection();
    }

    if (t.number_of_meshes == 1) {
        int32_t type = 0;
        KvtGetInteger("type_of_mesh", type);
        if (type > 0) AddQuadraticMesh();
    }

    int32_t gauss = 3;
    KvtGetInteger("type_of_gauss", gauss);
    FillShapeFunctions(gauss);

    for (int32_t m = 1; m <= t.number_of_meshes; ++m) WriteMeshInformation(t.meshes[m]);
    KvtCloseSection();
}

void WriteMeshInformation(const Mesh& mesh) {
    double lo[3] = {0.0, 0.0, 0.0}, hi[3] = {0.0, 0.0, 0.0};
    const std::vector<double>* coordinates[3] = {&mesh.x, &mesh.y, &mesh.z};
    if (mesh.NodeCount > 0)
        for (int c = 0; c < 3; ++c) {
            const auto [a, b] =
                std::minmax_element(coordinates[c]->begin() + 1, coordinates[c]->end());
            lo[c] = *a;
            hi[c] = *b;
        }
    WriteBlockHeading("Mesh information");
    WriteLabelled("Number of elements         : %", mesh.ElementCount);
    WriteLabelled("Number of nodes            : %", mesh.NodeCount);
    WriteLabelled("Number of sections         : %", static_cast<int32_t>(mesh.CodeSections.size()));
    WriteLabelled("Min x-coordinate (m)       : %", lo[0]);
    WriteLabelled("Max x-coordinate (m)       : %", hi[0]);
    WriteLabelled("Min y-coordinate (m)       : %", lo[1]);
    WriteLabelled("Max y-coordinate (m)       : %", hi[1]);
    WriteLabelled("Min z-coordinate (m)       : %", lo[2]);
    WriteLabelled("Max z-coordinate (m)       : %", hi[2]);
    WriteBlockHeading("");
}

void AddQuadraticMesh() {
    MeshTable& t = gMeshes;
    RefineMesh(t.meshes[1], t.meshes[2]);
    t.number_of_meshes = 2;
    t.meshes[2].id = 2;
    SetupMeshTopology(t.meshes[2]);
}
