// Output domains on a line mesh: the element search and the extraction at
// places between and on nodes, point lists that lose their points outside
// the mesh, lines with places beyond it, and the stops on settings a file
// can't have.
#include "mesh/output_domain.hpp"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <vector>

#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "support/log_capture.hpp"
#include "support/test_support.hpp"

namespace {

constexpr double kDelete = 1.0e-35;

class OutputDomain : public testing::Test {
protected:
    bwtest::TempDir dir;
    KvtHandle file = 0;
    std::vector<double> level = {0.0, 1.0, 3.0, 5.0, 7.0, 9.0};  // 1 + x on the nodes

    // Nodes at x = 0, 2, 4, 6, 8 with y = x / 10 and the bed at -1 - x / 2;
    // mesh 2 is its quadratic refinement.
    void SetUp() override {
        ResetMeshModel();
        Mesh& line = gMeshes.meshes[1];
        AllocateMesh(line, 5, 4, 2, "test");
        line.dimension = 1;
        for (int32_t i = 1; i <= 5; ++i) {
            line.x[i] = 2.0 * (i - 1), line.y[i] = line.x[i] / 10.0;
            line.z[i] = -1.0 - line.x[i] / 2.0;
            if (i == 5) break;
            line.ElementNodes[line.ElementStart[i]] = i;
            line.ElementNodes[line.ElementStart[i] + 1] = i + 1;
        }
        RefineMesh(line, gMeshes.meshes[2]);
    }
    void TearDown() override {
        if (file != 0) kvtClose(&file);
        gKvtAccess = KvtAccessState{};
        ResetMeshModel();
    }
    // The record of a section OUTPUT_FILE_1 of the given body, in a file of
    // the given name, with one item on mesh 1.
    OutputFile ReadRecord(const std::string& name, const std::string& body) {
        if (file != 0) kvtClose(&file);
        bwtest::WriteFile(dir / "m_FEM.kvt", "MeshSolverBW {\nOUTPUT_FILE_1 {\nfile_name = \"" +
                                                 (dir / name) + "\"\n" + body + "}\n}\n");
        file = KvtOpenFile(dir / "m_FEM.kvt", false);
        KvtUseFile(file);
        KvtOpenTarget("MeshSolverBW");
        KvtOpenSection("OUTPUT_FILE", 1);
        OutputFile r;
        SpecOutputDomain(r);
        r.items.resize(1);
        return r;
    }
    static std::string Points(const std::vector<double>& xs) {
        std::string text = "format = 0\nnumber_of_points = " + std::to_string(xs.size()) + "\n";
        for (size_t p = 0; p < xs.size(); ++p)
            text += "POINT_" + std::to_string(p + 1) + " {\nx = " + std::to_string(xs[p]) + "\n}\n";
        return text;
    }
};
using OutputDomainDeathTest = OutputDomain;

// The first element whose ends enclose x: a node between two elements
// belongs to the left one, and gives its value from either. A value between
// the ends is the straight line between them, on a quadratic element too,
// whatever its middle node holds; a place with no element, or an end at the
// delete value, gives the delete value.
TEST_F(OutputDomain, ElementSearchAndExtraction) {
    const Mesh& line = gMeshes.meshes[1];
    const std::vector<std::pair<double, int32_t>> cases = {{0.0, 1}, {2.0, 1},  {3.0, 2},
                                                           {8.0, 4}, {-0.1, 0}, {8.1, 0}};
    for (const auto& [x, element] : cases) {
        int32_t e = -1;
        FindLineElement(e, x, line);
        EXPECT_EQ(e, element) << x;
    }
    double v[5] = {};
    ExtractData(2, 1, {{1, 0.0}, {1, 2.0}, {2, 2.0}, {2, 3.0}, {0, 9.0}}, line, level, v, kDelete);
    EXPECT_EQ(std::vector<double>(v, v + 5), (std::vector<double>{1.0, 3.0, 3.0, 4.0, kDelete}));

    std::vector<double> u(10, 0.0);  // element 1 of mesh 2: nodes 1, 3 and the middle 2
    u[1] = 1.0, u[3] = 3.0, u[2] = 100.0;
    ExtractData(2, 1, {{1, 1.0}, {1, 0.5}}, gMeshes.meshes[2], u, v, kDelete);
    EXPECT_DOUBLE_EQ(v[0], 2.0);
    EXPECT_DOUBLE_EQ(v[1], 1.5);
    u[3] = kDelete;
    ExtractData(2, 1, {{1, 1.0}}, gMeshes.meshes[2], u, v, kDelete);
    EXPECT_EQ(v[0], kDelete);
}

// Points left and right of the mesh are dropped with a warning; the others
// keep their order, with y and z from the mesh, and are listed in the log.
// A list with no point inside turns the record off, and it gets no file.
TEST_F(OutputDomain, PointsOutsideTheMeshAreDropped) {
    bwtest::LogCapture log;
    OutputFile r = ReadRecord("gauges.xol0", Points({-1, 2, 3, 9}));
    SetupOutputDomain(r);
    EXPECT_TRUE(r.active);
    ASSERT_EQ(r.pointCount, 2);
    EXPECT_EQ(r.places[0].element, 1);
    EXPECT_EQ(r.places[1].element, 2);
    EXPECT_DOUBLE_EQ(r.places[1].y, 0.3);
    EXPECT_DOUBLE_EQ(r.places[1].z, -2.5);
    EXPECT_EQ(r.pointNames, (std::vector<std::string>{"Point 2", "Point 3"}));
    const std::string text = log.Text();
    EXPECT_NE(text.find("Warning: SetupPointDomain: Only 2 points inside domain"),
              std::string::npos)
        << text;
    EXPECT_NE(text.find("====================== Point Output Information ======================\n\n"
                        "  Element           x (m)           y (m)           z (m)  code\n\n"
                        "        1  0.20000000E+01  0.20000000E+00 -0.20000000E+01     0\n"
                        "        2  0.30000000E+01  0.30000000E+00 -0.25000000E+01     0\n"),
              std::string::npos)
        << text;

    std::vector<OutputFile> none = {ReadRecord("none.xol0", Points({-5, 20}))};
    SetupOutputDomain(none[0]);
    EXPECT_FALSE(none[0].active);
    EXPECT_NE(log.Text().find("Warning: SetupPointDomain: No points inside domain"),
              std::string::npos);
    OpenOutputFiles(1, none);
    CloseOutputFiles(1, none);
    EXPECT_FALSE(std::filesystem::exists(dir / "none.xol0"));
}

// Places of a line left of the mesh stay, with the land value as bed level
// in an xol1 file and the delete value in another; a line of one place passes.
TEST_F(OutputDomain, LinePlacesBeyondTheMesh) {
    const std::string area = "format = 1\ninterpolation_type = 2\nAREA {\nx_origo = -2\nx_ds = ";
    OutputFile r = ReadRecord("line.xol1", area + "3\nx_npoints = 4\n}\n");
    SetupOutputDomain(r);
    ASSERT_EQ(r.places.size(), 4u);
    EXPECT_EQ(r.places[0].element, 0);
    EXPECT_EQ(r.places[0].y, kDelete);
    EXPECT_EQ(r.places[0].z, 10.0);
    EXPECT_EQ(r.places[3].element, 4);  // x = 7
    r = ReadRecord("line.xolu", area + "1\nx_npoints = 1\n}\n");
    SetupOutputDomain(r);
    ASSERT_EQ(r.places.size(), 1u);
    EXPECT_EQ(r.places[0].z, kDelete);

    // A spacing that passed through a 32-bit real (2.0000000298) still puts
    // the places on the nodes, the last one too: a node's value is its own,
    // and a neighbour without a statistic (-1e-30) leaks nothing into it.
    r = ReadRecord("line.xol1",
                   "format = 1\ninterpolation_type = 2\nAREA {\nx_origo = 0\nx_ds = 2.0000000298\n"
                   "x_npoints = 5\n}\n");
    SetupOutputDomain(r);
    ASSERT_EQ(r.places.size(), 5u);
    EXPECT_EQ(r.places[4].element, 4);
    std::vector<double> stat = {0.0, 0.02, 0.03, -1.0e-30, 0.04, 0.05};
    double v[5] = {};
    ExtractData(2, 1, r.places, gMeshes.meshes[1], stat, v, kDelete);
    EXPECT_EQ(std::vector<double>(v, v + 5),
              (std::vector<double>{0.02, 0.03, -1.0e-30, 0.04, 0.05}));
}

// What a file can't have stops the run with the routine's message (the
// wrong file types and a line that runs backwards: from a model file, in
// the run tests of the output).
TEST_F(OutputDomainDeathTest, SettingsAFileCantHave) {
    const std::vector<std::vector<std::string>> cases = {
        {"l.xol1", "format = 1\nAREA {\nx_npoints = 0\n}\n",
         "SetupAreaDomain: Number of points must be larger than one"},
        {"l.xol1", "format = 3\n", "SpecOutputDomain: Output format not supported"}};
    for (const auto& c : cases) {
        OutputFile r = ReadRecord(c[0], c[1]);
        EXPECT_EXIT((dup2(2, 1), SetupOutputDomain(r)), testing::ExitedWithCode(1), c[2]) << c[1];
    }
    std::vector<OutputFile> records = {ReadRecord("l.xol1", "format = 1\nAREA {\n}\n")};
    SetupOutputDomain(records[0]);
    double v = 0.0;
    EXPECT_EXIT(
        (dup2(2, 1), ExtractData(2, 2, records[0].places, gMeshes.meshes[1], level, &v, kDelete)),
        testing::ExitedWithCode(1), "ExtractData: Interpolation is not implemented");
    records[0].format = 5;
    EXPECT_EXIT((dup2(2, 1), OpenOutputFiles(1, records)), testing::ExitedWithCode(1),
                "OpenOutputFiles: Output format not supported");
    EXPECT_EXIT((dup2(2, 1), CloseOutputFiles(1, records)), testing::ExitedWithCode(1),
                "Output format not supported, file: .*l.xol1");
    EXPECT_EXIT((dup2(2, 1), ReadRecord("p.xol0", "time_step_frequency = 0\n")),
                testing::ExitedWithCode(1), "time_step_frequency must be at least 1");
}

}  // namespace
