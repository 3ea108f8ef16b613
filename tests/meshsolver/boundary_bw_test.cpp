// The boundary data of the 1DH model: the sets that the codes of a line
// make, with node types and outward directions, and the values a step
// sees: series interpolated in time, soft start from a reference value.
#include "meshsolver/boundary_bw.hpp"

#include <gtest/gtest.h>

#include "equations_flume.hpp"
#include "support/model_builder.hpp"

namespace {

// A line of n nodes 1 m apart with the given codes and its refinement.
void MakeMeshes(int32_t n, const std::vector<std::pair<int32_t, int32_t>>& codes) {
    bwtest::BuildFlume(
        n - 1, n - 1.0, [](double) { return 1.0; }, 1, 0.0, 0.5);
    for (auto [node, code] : codes) bwtest::SetNodeCode(node, code);
}

class BoundarySets : public testing::Test {
protected:
    bwtest::TempDir dir;
    BwModel model;

    // Reads the given CODE_n sections for a run of `steps` steps of 0.5 s.
    void Setup(const std::string& codes, int32_t steps = 20) {
        bwtest::ReadBoundaryConditions(model, dir / "s.kvt", codes, 0.5, steps);
    }
    static const BoundaryNode* At(const BoundarySet& set, int32_t node) {
        const int32_t r = set.recordOfNode[node];
        return r > 0 ? &set.records[r - 1] : nullptr;
    }
};

// Walls at both ends and an internal generation line at node 3 of a line of
// 5 nodes (the codes the model reader writes with a generation record): the
// end nodes are flux nodes pointing out of the line, the generation node has
// node type 4, every node with data is in the auxiliary set; the values of a
// step: the walls 0, the generation line its series (item 1 in the velocity
// set, item 2 in the auxiliary set).
TEST_F(BoundarySets, CodesMakeTheirNodeTypesDirectionsAndValues) {
    MakeMeshes(5, {{1, 2}, {3, 3}, {5, 4}});
    bwtest::WriteSeriesFile(dir / "gen.xol0", "2004-01-01 00:00:00", 1.0,
                            {std::vector<float>(12, 0.25f), std::vector<float>(12, -0.5f)});
    Setup(
        "CODE_2 {\ntype = 4\nformat = 0\n}\n"
        "CODE_3 {\ntype = 6\nformat = 1\nsoft_time_interval = 0.0\nfile_name = \"" +
        (dir / "gen.xol0") + "\"\nitem_numbers = 1, 2\n}\nCODE_4 {\ntype = 4\nformat = 0\n}\n");
    // Velocity mesh: old node i is node 2i - 1.
    const BoundarySet& v = model.VelocitySet;
    ASSERT_EQ(v.records.size(), 3u);
    const struct {
        int32_t node, type;
        double direction;
    } expected[] = {{1, kNodeFlux, -1.0}, {9, kNodeFlux, 1.0}, {5, kNodeGeneration, -1.0}};
    for (const auto& e : expected) {
        ASSERT_NE(At(v, e.node), nullptr) << e.node;
        EXPECT_EQ(At(v, e.node)->nodeType, e.type) << e.node;
        EXPECT_EQ(At(v, e.node)->direction[0], e.direction) << e.node;
    }
    EXPECT_TRUE(model.ElevationSet.records.empty());
    EXPECT_EQ(model.AuxSet.records.size(), 3u);
    for (int32_t node : {1, 3, 5}) {
        ASSERT_NE(At(model.AuxSet, node), nullptr) << node;
        EXPECT_EQ(At(model.AuxSet, node)->nodeType, kNodeNoData);
    }
    UpdateForcingsBW(0.0, model);
    UpdateForcingsBW(0.5, model);
    EXPECT_EQ(v.time, 0.5);
    EXPECT_EQ(At(v, 1)->Value[0], 0.0);
    EXPECT_EQ(At(v, 9)->Value[1], 0.0);
    EXPECT_DOUBLE_EQ(At(v, 5)->Value[0], 0.25);
    EXPECT_DOUBLE_EQ(At(v, 5)->Value[1], 0.25);
    EXPECT_DOUBLE_EQ(At(model.AuxSet, 3)->Value[0], -0.5);
}

// A series is interpolated in time between its records; its start may lie
// before the run's, and the file is refused when it ends before the run.
TEST_F(BoundarySets, SeriesInterpolatedInTime) {
    MakeMeshes(3, {{1, 2}, {3, 3}});
    // Records every 2 s from 1 s before the run's start: 0, 4, 2, 6, ...
    bwtest::WriteSeriesFile(dir / "q.xol0", "2003-12-31 23:59:59", 2.0,
                            {{0.0f, 4.0f, 2.0f, 6.0f, 6.0f, 6.0f, 6.0f}});
    const std::string code =
        "CODE_2 {\ntype = 3\nformat = 1\ntype_of_soft_start = 0\nfile_name = \"" +
        (dir / "q.xol0") + "\"\nitem_numbers = 1\n}\nCODE_3 {\ntype = 1\n}\n";
    Setup(code, 10);
    const DataInput& data = model.BoundaryCodes[0].data;
    double values[2] = {-1.0, -1.0};
    for (const auto& [t, q] : {std::pair{0.0, 2.0}, {2.5, 2.5}, {4.0, 4.0}}) {
        DataInputValues(data, t, values);
        EXPECT_DOUBLE_EQ(values[0], q) << t;
    }
    EXPECT_EQ(values[1], 0.0) << "no second item";
    UpdateForcingsBW(2.0, model);
    EXPECT_DOUBLE_EQ(At(model.VelocitySet, 1)->Value[0], 3.0);

    setenv("TRF", "HUD", 1);  // the stop text to standard error
    EXPECT_EXIT(Setup(code, 30), testing::ExitedWithCode(1),
                "XOL data does not cover the simulation period");
    unsetenv("TRF");
}

// No soft start, a zero interval or a time past it: the full value; within
// the interval the ramp rises from the reference value, halfway at half the
// interval. (The ramp's whole course is checked by the water a flux boundary
// lets in.)
TEST(SoftStart, RampsFromTheReferenceValue) {
    EXPECT_EQ(SoftStartFactor(2, 0.0, 0.0), 1.0);
    EXPECT_EQ(SoftStartFactor(0, 10.0, 1.0), 1.0);
    EXPECT_EQ(SoftStartFactor(2, 10.0, 10.5), 1.0);
    DataInput data;
    data.constantValues[0] = 3.0;
    data.constantValues[1] = -2.0;
    data.referenceValues[0] = 1.0;
    data.softStartType = 2;
    data.softTimeInterval = 4.0;
    double values[2];
    DataInputValues(data, 2.0, values);
    EXPECT_DOUBLE_EQ(values[0], 2.0);
    EXPECT_DOUBLE_EQ(values[1], -1.0);
}

}  // namespace
