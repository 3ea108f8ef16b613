// The line meshes from bathymetry files: nodes, codes and dry ends of a file
// of one item (equidistant) and of two (x given), the quadratic mesh made
// from a line, element lengths and code sections, the DOMAIN section with
// its code lists, datum and refinement, the block "Mesh information", and
// the stops on files a run can't use.
#include "mesh/mesh.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "mesh/mesh_read.hpp"
#include "mesh/shape.hpp"
#include "mesh/space_discretization.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

// A line of 6 points 2 m apart whose two ends stand on land.
const std::vector<float> kLevels = {0.5f, -1.0f, -2.0f, -3.0f, -4.0f, 1.0f};

void WriteLevels(const std::string& path, const std::vector<std::vector<float>>& items,
                 float spacing = 2.0f) {
    std::vector<std::vector<std::vector<float>>> steps;
    for (const auto& item : items) steps.push_back({item});
    bwtest::WriteLineFile(path, "2004-01-01 00:00:00", 1.0, spacing, steps);
}

template <typename T>
std::vector<T> Nodes(const std::vector<T>& v) {
    return {v.begin() + 1, v.end()};
}

std::vector<std::vector<int32_t>> ElementNodes(const Mesh& m) {
    std::vector<std::vector<int32_t>> out;
    for (int32_t e = 1; e <= m.ElementCount; ++e) {
        out.emplace_back();
        for (int32_t k = 1; k <= GetElementNodeCount(m, e); ++k)
            out.back().push_back(GetElementNode(m, e, k));
    }
    return out;
}

class MeshModel : public testing::Test {
protected:
    bwtest::TempDir dir;
    KvtHandle file = 0;
    void SetUp() override {
        ResetMeshModel();
        setenv("TRF", "HUD", 1);  // stop texts go to standard error, where death tests read them
    }
    void TearDown() override {
        unsetenv("TRF");
        if (file != 0) kvtClose(&file);
        gKvtAccess = KvtAccessState{};
        ResetMeshModel();
    }
    // Makes a solver file whose DOMAIN section has the given body current.
    void UseDomain(const std::string& body) {
        bwtest::WriteFile(dir / "m_FEM.kvt", "MeshSolverBW {\nDOMAIN {\n" + body + "}\n}\n");
        file = KvtOpenFile(dir / "m_FEM.kvt", false);
        KvtUseFile(file);
        KvtOpenTarget("MeshSolverBW");
    }
};
using MeshModelDeathTest = MeshModel;

// Two items: x comes from the first; the line is not equidistant, so its
// elements differ in length, and so do those of its refinement.
TEST_F(MeshModel, LineOfGivenPositionsAndItsRefinement) {
    WriteLevels(dir / "bed.XOL1", {{0.0f, 1.0f, 3.0f, 6.0f}, {-1.0f, -2.0f, -3.0f, -5.0f}}, 9.0f);
    Mesh line, fine;
    ReadMesh(dir / "bed.XOL1", line);
    EXPECT_EQ(Nodes(line.x), std::vector<double>({0, 1, 3, 6}));
    EXPECT_EQ(Nodes(line.z), std::vector<double>({-1, -2, -3, -5}));
    line.code[3] = 4;
    SetupMeshTopology(line);
    EXPECT_EQ(Nodes(line.ElementLength), std::vector<double>({1, 2, 3}));

    RefineMesh(line, fine);
    SetupMeshTopology(fine);
    EXPECT_EQ(Nodes(fine.x), std::vector<double>({0, 0.5, 1, 2, 3, 4.5, 6}));
    EXPECT_EQ(Nodes(fine.z), std::vector<double>({-1, -1.5, -2, -2.5, -3, -4, -5}));
    // Left, right, middle.
    EXPECT_EQ(ElementNodes(fine),
              (std::vector<std::vector<int32_t>>{{1, 3, 2}, {3, 5, 4}, {5, 7, 6}}));
    // Sections of the nonzero codes, ascending, with their nodes.
    ASSERT_EQ(fine.CodeSections.size(), 2u);
    EXPECT_EQ(std::make_pair(fine.CodeSections[0].code, fine.CodeSections[0].nodes),
              std::make_pair(2, std::vector<int32_t>({1, 7})));
    EXPECT_EQ(std::make_pair(fine.CodeSections[1].code, fine.CodeSections[1].nodes),
              std::make_pair(4, std::vector<int32_t>({5})));
}

TEST_F(MeshModel, DatumAndClipOfBoundaryLevels) {
    Mesh m;
    AllocateMesh(m, 5, 4, 2, "test");
    const double z[] = {-1.0, -1.0, -3.0, 0.5, -1.0};
    const int32_t code[] = {2, 0, 2, 3, 3};
    for (int32_t i = 1; i <= 5; ++i) m.z[i] = z[i - 1] + 10.0, m.code[i] = code[i - 1];
    // Lift boundary levels in (-2, -0.5] to -2; then codes over nodes 2 and 5,
    // and a node beyond the mesh passed over.
    const int32_t nodes[] = {2, 5, 9}, values[] = {7, 0, 1};
    TreatMesh(m, 10.0, -2.0, -0.5, nodes, values, 3);
    EXPECT_EQ(Nodes(m.z), std::vector<double>({-2, -1, -3, 0.5, -2}));
    EXPECT_EQ(Nodes(m.code), std::vector<int32_t>({2, 7, 2, 3, 0}));
}

TEST_F(MeshModel, DomainSectionMakesBothMeshesAndReportsThem) {
    WriteLevels(dir / "bed.xol1", {kLevels});
    UseDomain(
        "number_of_dimensions = 1\nnumber_of_meshes = 1\nfile_name = file(\"bed.xol1\")\n"
        "datum_depth = -0.5\nnumber_of_nodes = 2\nnode_number_of_code = 3, 6\n"
        "value_of_code = 2, 3\ntype_of_mesh = 2\ntype_of_gauss = 3\n");
    bwtest::LogCapture log;
    SetupSpaceDiscretization(1);
    ASSERT_EQ(gMeshes.number_of_meshes, 2);
    const Mesh& line = gMeshes.meshes[1];
    const Mesh& fine = gMeshes.meshes[2];
    EXPECT_EQ(std::make_pair(line.id, fine.id), std::make_pair(1, 2));
    EXPECT_EQ(Nodes(line.x), std::vector<double>({0, 2, 4, 6, 8, 10}));
    // The datum, and the dry ends at the level of their neighbours.
    EXPECT_EQ(Nodes(line.z), std::vector<double>({-0.5, -0.5, -1.5, -2.5, -3.5, -3.5}));
    EXPECT_EQ(Nodes(line.code), std::vector<int32_t>({2, 0, 2, 0, 0, 3}));
    // The refinement carries the codes as they stand after the lists.
    EXPECT_EQ(fine.code[5], 2);
    EXPECT_EQ(fine.code[11], 3);
    EXPECT_EQ(fine.CodeSections.size(), 2u);
    for (int32_t s = 1; s <= gShapes.count; ++s) EXPECT_EQ(gShapes.shapes[s].gaussCount, 3);

    const std::vector<std::string> lines = log.Lines();
    const std::vector<std::string> block = {
        "",
        std::string(26, '=') + " Mesh information " + std::string(26, '='),
        "",
        "  Number of elements         : 5",
        "  Number of nodes            : 6",
        "  Number of sections         : 2",
        "  Min x-coordinate (m)       : 0",
        "  Max x-coordinate (m)       : 10",
        "  Min y-coordinate (m)       : 0",
        "  Max y-coordinate (m)       : 0",
        "  Min z-coordinate (m)       : -3.5",
        "  Max z-coordinate (m)       : -0.5",
        std::string(70, '=')};
    ASSERT_EQ(lines.size(), 2 * block.size());
    EXPECT_EQ(std::vector<std::string>(lines.begin(), lines.begin() + block.size()), block);
    EXPECT_EQ(lines[block.size() + 4], "  Number of nodes            : 11");
}

TEST_F(MeshModelDeathTest, BathymetryFilesThatStop) {
    bwtest::MapSpec grid;
    grid.J = 3, grid.K = 2;
    bwtest::WriteMapFile(dir / "map.xol1", grid, bwtest::Constant(grid, -1.0f));
    WriteLevels(dir / "three.xol1", {kLevels, kLevels, kLevels});
    Mesh m;
    EXPECT_EXIT(ReadMesh(dir / "map.xol1", m), testing::ExitedWithCode(1),
                "ReadMeshBasicXol1: Wrong mesh file");
    EXPECT_EXIT(ReadMesh(dir / "three.xol1", m), testing::ExitedWithCode(1),
                "ReadMeshBasicXol1: Wrong number of items in file");
    EXPECT_EXIT(ReadMesh(dir / "bed.mesh", m), testing::ExitedWithCode(1),
                "ReadMesh: Unknown type of mesh file");
}

}  // namespace
