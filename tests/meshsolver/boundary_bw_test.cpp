// The boundary data of the 1DH model: the sets that the codes of a line
// make, with node types and outward directions, and the values a step
// sees: soft start, series interpolated in time, the sine of format 5.
#include "meshsolver/boundary_bw.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <filesystem>
#include <numbers>

#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "mesh/mesh.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "platform/kvt/kvt.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

constexpr double kPi = std::numbers::pi;

// A line of n nodes 1 m apart with the given codes, mesh 1, and its
// quadratic refinement, mesh 2, as the solver's DOMAIN makes them.
void MakeMeshes(int32_t n, const std::vector<std::pair<int32_t, int32_t>>& codes) {
    ResetMeshModel();
    Mesh& line = gMeshes.meshes[1];
    AllocateMesh(line, n, n - 1, 2, "test");
    line.id = 1;
    line.dimension = 1;
    for (int32_t i = 1; i <= n; ++i) line.x[i] = i - 1.0;
    for (int32_t e = 1; e < n; ++e) {
        line.ElementType[e] = kLinearLine;
        line.ElementNodes[line.ElementStart[e]] = e;
        line.ElementNodes[line.ElementStart[e] + 1] = e + 1;
    }
    for (auto [node, code] : codes) line.code[node] = code;
    SetupMeshTopology(line);
    RefineMesh(line, gMeshes.meshes[2]);
    gMeshes.meshes[2].id = 2;
    SetupMeshTopology(gMeshes.meshes[2]);
    gMeshes.number_of_meshes = 2;
}

class BoundarySets : public testing::Test {
protected:
    bwtest::TempDir dir;
    KvtHandle file = 0;
    BwModel model;

    // Reads BOUNDARY_CONDITIONS with the given CODE_n sections, for a run of
    // `steps` steps of 0.5 s from 2004-01-01.
    void Setup(const std::string& codes, int32_t steps = 20) {
        gMeshRun = MeshRunState{};
        gMeshRun.StartDate = MakeDateTime(2004, 1, 1, 0, 0, 0);
        gMeshRun.TimeStepInterval = 0.5;
        gMeshRun.LastStep = steps;
        bwtest::WriteFile(dir / "s.kvt",
                          "MeshSolverBW {\nBOUSSINESQ_WAVE_MODULE {\n"
                          "BOUNDARY_CONDITIONS {\n" +
                              codes + "}\n}\n}\n");
        testing::internal::CaptureStdout();
        file = KvtOpenFile(dir / "s.kvt", false);
        KvtUseFile(file);
        KvtOpenTarget("MeshSolverBW");
        KvtOpenSection("BOUSSINESQ_WAVE_MODULE");
        SetupBoundCondBW(model);
        KvtCloseSection();
        testing::internal::GetCapturedStdout();
    }
    void TearDown() override { kvtClose(&file); }
    static const BoundaryNode* At(const BoundarySet& set, int32_t node) {
        const int32_t r = set.recordOfNode[node];
        return r > 0 ? &set.records[r - 1] : nullptr;
    }
};

// Walls at both ends and an internal generation line at node 3 of a line of
// 5 nodes (the codes the model reader writes with a generation record):
// the end nodes are flux nodes pointing out of the line, the generation
// node has node type 4, and every node with data is in the auxiliary set.
TEST_F(BoundarySets, GenerationLineAndWallsMakeTheirNodeTypes) {
    MakeMeshes(5, {{1, 2}, {3, 3}, {5, 4}});
    bwtest::WriteSeriesFile(dir / "gen.xol0", "2004-01-01 00:00:00", 1.0,
                            {std::vector<float>(12, 0.25f), std::vector<float>(12, -0.5f)});
    Setup(
        "CODE_2 {\ntype = 4\nformat = 0\n}\n"
        "CODE_3 {\ntype = 6\nformat = 1\nsoft_time_interval = 0.0\nfile_name = \"" +
        (dir / "gen.xol0") + "\"\nitem_numbers = 1, 2\n}\nCODE_4 {\ntype = 4\nformat = 0\n}\n");
    ASSERT_EQ(model.BoundaryCodes.size(), 3u);

    // Velocity mesh: old node i is node 2i - 1.
    const BoundarySet& v = model.VelocitySet;
    ASSERT_EQ(v.records.size(), 3u);
    ASSERT_NE(At(v, 1), nullptr);
    ASSERT_NE(At(v, 5), nullptr);
    ASSERT_NE(At(v, 9), nullptr);
    EXPECT_EQ(At(v, 1)->nodeType, kNodeFlux);
    EXPECT_EQ(At(v, 9)->nodeType, kNodeFlux);
    EXPECT_EQ(At(v, 5)->nodeType, kNodeGeneration);
    EXPECT_EQ(At(v, 1)->direction[0], -1.0);
    EXPECT_EQ(At(v, 9)->direction[0], 1.0);
    EXPECT_EQ(At(v, 5)->direction[0], -1.0) << "the element to its right touches it last";
    EXPECT_EQ(v.recordOfNode.size(), 10u);
    EXPECT_TRUE(model.ElevationSet.records.empty());
    EXPECT_EQ(model.AuxSet.records.size(), 3u);
    for (int32_t node : {1, 3, 5}) {
        ASSERT_NE(At(model.AuxSet, node), nullptr) << node;
        EXPECT_EQ(At(model.AuxSet, node)->nodeType, kNodeNoData);
    }

    // The start and the first step: both slots hold a value, the walls 0,
    // the generation line its series (item 1 in the velocity set, item 2
    // in the auxiliary set).
    UpdateForcingsBW(0.0, model);
    UpdateForcingsBW(0.5, model);
    EXPECT_EQ(v.time, 0.5);
    EXPECT_EQ(model.AuxSet.time, 0.5);
    EXPECT_EQ(At(v, 1)->Value[0], 0.0);
    EXPECT_EQ(At(v, 9)->Value[1], 0.0);
    EXPECT_DOUBLE_EQ(At(v, 5)->Value[0], 0.25);
    EXPECT_DOUBLE_EQ(At(v, 5)->Value[1], 0.25);
    EXPECT_DOUBLE_EQ(At(model.AuxSet, 3)->Value[0], -0.5);
}

// Later passes override: a code of type 1 and one of type 2 keep their own
// node types, a code of type 5 is a flux node, and only codes with nodes
// open a section.
TEST_F(BoundarySets, CodeTypesWithoutData) {
    MakeMeshes(4, {{1, 2}, {2, 7}, {4, 3}});
    Setup("CODE_2 {\ntype = 1\n}\nCODE_3 {\ntype = 2\n}\nCODE_7 {\ntype = 5\n}\n");
    const BoundarySet& v = model.VelocitySet;
    EXPECT_EQ(At(v, 1)->nodeType, kNodeWallFlux);
    EXPECT_EQ(At(v, 7)->nodeType, kNodeNoData);
    EXPECT_EQ(At(v, 3)->nodeType, kNodeFlux);
    EXPECT_EQ(At(v, 3)->direction[0], -1.0);
    EXPECT_EQ(model.AuxSet.records.size(), 1u) << "types 3 to 6 only";
}

// A series is interpolated in time between its records; its start may lie
// before the run's, and the file is refused when it ends before the run.
TEST_F(BoundarySets, SeriesInterpolatedInTime) {
    MakeMeshes(3, {{1, 2}, {3, 3}});
    // Records every 2 s from 1 s before the run's start: 0, 4, 2, 6, ...
    bwtest::WriteSeriesFile(dir / "q.xol0", "2003-12-31 23:59:59", 2.0,
                            {{0.0f, 4.0f, 2.0f, 6.0f, 6.0f, 6.0f, 6.0f}});
    Setup("CODE_2 {\ntype = 3\nformat = 1\ntype_of_soft_start = 0\nfile_name = \"" +
              (dir / "q.xol0") + "\"\nitem_numbers = 1\n}\nCODE_3 {\ntype = 1\n}\n",
          10);
    const DataInput& data = model.BoundaryCodes[0].data;
    EXPECT_EQ(data.itemNumbers[1], 0);
    double values[2] = {-1.0, -1.0};
    DataInputValues(data, 0.0, values);
    EXPECT_DOUBLE_EQ(values[0], 2.0);
    EXPECT_EQ(values[1], 0.0) << "no second item";
    DataInputValues(data, 2.5, values);
    EXPECT_DOUBLE_EQ(values[0], 2.5);
    DataInputValues(data, 4.0, values);
    EXPECT_DOUBLE_EQ(values[0], 4.0);
    UpdateForcingsBW(2.0, model);
    EXPECT_DOUBLE_EQ(At(model.VelocitySet, 1)->Value[0], 3.0);

    const std::string code = "CODE_2 {\ntype = 3\nformat = 1\nfile_name = \"" + (dir / "q.xol0") +
                             "\"\nitem_numbers = 1\n}\n";
    EXPECT_EXIT(Setup(code + "CODE_3 {\ntype = 1\n}\n", 30), testing::ExitedWithCode(1), "");
}

// f = 1 without soft start, with T = 0 and after T; linear and sine ramps
// from the reference value before.
TEST(SoftStart, RampsFromTheReferenceValue) {
    EXPECT_EQ(SoftStartFactor(2, 0.0, 0.0), 1.0);
    EXPECT_EQ(SoftStartFactor(1, 0.0, 0.0), 1.0);
    EXPECT_EQ(SoftStartFactor(0, 10.0, 1.0), 1.0);
    EXPECT_EQ(SoftStartFactor(1, 10.0, 10.5), 1.0);
    EXPECT_DOUBLE_EQ(SoftStartFactor(1, 10.0, 2.5), 0.25);
    EXPECT_NEAR(SoftStartFactor(2, 10.0, 0.0), 0.0, 1e-15);
    EXPECT_DOUBLE_EQ(SoftStartFactor(2, 10.0, 5.0), 0.5);
    EXPECT_DOUBLE_EQ(SoftStartFactor(2, 10.0, 2.5), (1.0 - std::sqrt(0.5)) / 2.0);
    EXPECT_DOUBLE_EQ(SoftStartFactor(2, 10.0, 10.0), 1.0);

    DataInput data;
    data.constantValues[0] = 3.0;
    data.constantValues[1] = -2.0;
    data.referenceValues[0] = 1.0;
    data.softStartType = 1;
    data.softTimeInterval = 4.0;
    double values[2];
    DataInputValues(data, 1.0, values);
    EXPECT_DOUBLE_EQ(values[0], 1.5);
    EXPECT_DOUBLE_EQ(values[1], -0.5);

    // Format 5: a sine of the range about the reference level, no ramp.
    DataInput sine;
    sine.format = 5;
    sine.referenceLevel = 0.5;
    sine.range = 2.0;
    sine.period = 8.0;
    sine.phase = 1.0;
    sine.softTimeInterval = 100.0;
    DataInputValues(sine, 1.0, values);
    EXPECT_DOUBLE_EQ(values[0], 0.5 + std::sin(2.0 * kPi * 2.0 / 8.0));
}

}  // namespace
