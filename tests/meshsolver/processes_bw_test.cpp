// The depth of the 1DH model: the blow-up check of the total depth with its
// report, the slot that keeps dry nodes wet, the number form of the report
// and the block "Simulation information".
#include "meshsolver/processes_bw.hpp"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cmath>
#include <numbers>
#include <string>
#include <vector>

#include "mesh/mesh.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

struct DepthCase {
    std::vector<double> d, eta;  // slot 0 unused
    std::vector<double> h, b;
    int32_t status = 99;
    std::string log;

    DepthCase(std::vector<double> depth, std::vector<double> surface)
        : d(std::move(depth)), eta(std::move(surface)), h(d.size(), -7.0), b(d.size(), -7.0) {}
    void Run(const SlotSettingsBW& slot = {}) {
        testing::internal::CaptureStdout();
        SetDepthBW(static_cast<int32_t>(d.size()) - 1, h, d, eta.data(), b, slot, status);
        log = testing::internal::GetCapturedStdout();
    }
};

std::string Report(const char* heading, const char* node, const char* h, const char* eta,
                   const char* d) {
    return "\n\n" + std::string(15, '-') + heading + std::string(17, '-') + "\n" +
           " node number                             : " + node + "\n" +
           " total water depth (h)                   : " + h + "\n" +
           " surface elevation (s)                   : " + eta + "\n" +
           " still water depth (d)                   : " + d + "\n" + std::string(64, '-') + "\n";
}

// A node that is just dry (h = 0) and a surface exactly 50 high are sound;
// the state is checked from node 1 on and the first offence is reported.
TEST(SetDepthBW, BlowUpAtTheFirstOffendingNodeOnly) {
    DepthCase sound({0.0, 2.0, 1.0, 60.0, 3.0}, {0.0, 0.5, -1.0, -50.0, 50.0});
    sound.Run();
    EXPECT_EQ(sound.status, 0);
    EXPECT_EQ(sound.log, "");
    EXPECT_EQ(sound.h, (std::vector<double>{-7.0, 2.5, 0.0, 10.0, 53.0}));
    EXPECT_EQ(sound.b, (std::vector<double>{-7.0, 1.0, 1.0, 1.0, 1.0}));

    DepthCase dry({0.0, 2.0, 1.0, 1.0}, {0.0, 0.0, -1.25, 60.0});
    dry.Run();
    EXPECT_EQ(dry.status, -1);
    EXPECT_EQ(dry.log,
              Report(" BLOW-UP - Negative water depth ", "                   2",
                     "         -0.2500E+00", "         -0.1250E+01", "          0.1000E+01"));

    DepthCase high({0.0, 2.0, 60.0, 1.0}, {0.0, 0.0, -50.5, -5.0});
    high.Run();
    EXPECT_EQ(high.status, -1);
    EXPECT_EQ(high.log,
              Report(" BLOW-UP - Elevation too large ", "                   2",
                     "          0.9500E+01", "         -0.5050E+02", "          0.6000E+02"));

    // A surface that is no number any more is no sound state either.
    DepthCase lost({0.0, 2.0}, {0.0, std::nan("")});
    lost.Run();
    EXPECT_EQ(lost.status, -1);
    EXPECT_NE(lost.log.find("Elevation too large"), std::string::npos);
    EXPECT_NE(lost.log.find("                 NaN\n"), std::string::npos) << lost.log;
}

// Under a slot (bed more than `depth` below the datum) a dry node keeps a
// positive depth that joins the wet one continuously at h = 0, the storage
// width falls from 1 at the bed towards w far below it, and a node whose
// bed lies above the slot level is left as it is.
TEST(SetDepthBW, SlotKeepsDryNodesWetAndJoinsTheWetDepth) {
    SlotSettingsBW slot;
    slot.type = 1;
    slot.depth = -10.0;
    slot.maxDepth = 4.0;
    slot.width = 0.01;
    slot.smoothing = 5.0;
    const double eps = 1e-9;
    // Node 1 dry by 2 m below a bed 3 m above the datum, node 2 just dry,
    // node 3 just wet, node 4 wet; node 5 is a bed 12 m deep, below the
    // slot level -10. The slot is max_depth = 4 high at all the others.
    DepthCase c({0.0, -3.0, -3.0, -3.0, -3.0, 12.0}, {0.0, 1.0, 3.0 - eps, 3.0 + eps, 4.0, -1.0});
    c.Run(slot);
    ASSERT_EQ(c.status, 0) << c.log;
    const double L = 4.0, w = 0.01, s = 5.0;
    for (int i : {1, 2, 3, 4}) EXPECT_GT(c.h[i], 0.0) << i;
    EXPECT_NEAR(c.h[2], c.h[3], 1e-6) << "continuous at h = 0";
    EXPECT_NEAR(c.h[3], L * (w + (1.0 - w) * (1.0 - std::exp(-s)) / s), 1e-6);
    EXPECT_NEAR(c.h[4] - 1.0, c.h[3], 1e-6) << "a wet node is shifted by the slot volume";
    EXPECT_LT(c.h[1], c.h[2]);
    EXPECT_NEAR(c.b[2], 1.0, 1e-6) << "full width at the bed";
    EXPECT_LT(c.b[1], 1.0);
    EXPECT_GT(c.b[1], w);
    EXPECT_EQ(c.b[3], 1.0);
    EXPECT_EQ(c.h[5], 11.0);
    EXPECT_EQ(c.b[5], 1.0);
    // A bed 7 m deep has a slot of L0 = 3 m down to the slot level. At its
    // bottom (xi = 1) the dry depth is 0 and the width w plus the smoothed part.
    DepthCase bottom({0.0, 7.0}, {0.0, -10.0});
    bottom.Run(slot);
    EXPECT_EQ(bottom.status, 0);
    EXPECT_NEAR(bottom.h[1], 0.0, 1e-12);
    EXPECT_NEAR(bottom.b[1], w + (1.0 - w) * std::exp(-s), 1e-12);
}

TEST(ExponentField, FormOfTheBlowUpReport) {
    EXPECT_EQ(ExponentField(0.0, 20, 4), "          0.0000E+00");
    EXPECT_EQ(ExponentField(-1.0, 20, 4), "         -0.1000E+01");
    EXPECT_EQ(ExponentField(123456.0, 20, 4), "          0.1235E+06");
    EXPECT_EQ(ExponentField(9.99996, 20, 4), "          0.1000E+02") << "rounding carries";
    EXPECT_EQ(ExponentField(0.00012344, 20, 4), "          0.1234E-03");
    EXPECT_EQ(ExponentField(2.5e-120, 20, 4), "          0.2500-119");
    EXPECT_EQ(ExponentField(-1.0, 6, 4), "******");
}

// A line of three nodes, elements of 2 m and 4 m, with a dry node: the
// depth range, the lengths and the Courant number of the deepest element
// for its length.
TEST(SimulationInformation, DepthLengthAndCourantNumber) {
    Mesh line;
    AllocateMesh(line, 3, 2, 2, "test");
    line.x = {0.0, 0.0, 2.0, 6.0};
    for (int32_t e = 1; e <= 2; ++e) {
        line.ElementNodes[line.ElementStart[e]] = e;
        line.ElementNodes[line.ElementStart[e] + 1] = e + 1;
        line.ElementLength[e] = line.x[e + 1] - line.x[e];
    }
    const std::vector<double> d = {0.0, 2.0, 8.0, -1.0};
    testing::internal::CaptureStdout();
    WriteSimulationInformation(line, d, 0.5);
    const std::string log = testing::internal::GetCapturedStdout();
    for (const char* text :
         {"Simulation information", "  Min depth                  : -1\n",
          "  Max depth                  : 8\n", "  Min length                 : 2\n",
          "  Max length                 : 4\n", "  Max Courant number         : 2.214723\n"})
        EXPECT_NE(log.find(text), std::string::npos) << text << "\n" << log;
    EXPECT_EQ(log.substr(log.size() - 2), "\n\n") << "an empty line closes the block";
}

// A line of n nodes at x = node number, still water 10 m deep, with a
// front face of slope -0.5 from a crest plateau 5 m high at node 140 down
// to the toe at node `toe`, the surface flat at 0 behind it.
struct RollerCase {
    Mesh line;
    BreakingStateBW b;
    std::vector<double> eta, rate, d, h;

    RollerCase(int32_t n, int32_t toe) {
        AllocateMesh(line, n, n - 1, 2, "test");
        for (int32_t i = 1; i <= n; ++i) line.x[i] = i;
        const size_t size = static_cast<size_t>(n) + 1;
        eta.assign(size, 0.0);
        for (int32_t i = 1; i <= n; ++i)
            eta[i] = i < toe - 10 ? 5.0 : i < toe ? 0.5 * (toe - i) : 0.0;
        rate.assign(size, 0.0);
        d.assign(size, 10.0);
        h.assign(size, 10.0);
        b.type = 1;
        b.tanInitial = std::tan(20.0 * std::numbers::pi / 180.0);
        b.tanFinal = std::tan(10.0 * std::numbers::pi / 180.0);
        for (std::vector<double>* v : {&b.delta, &b.deltaOld, &b.slope, &b.celerity})
            v->assign(size, 0.0);
        b.tanPhi.assign(size, b.tanInitial);
        b.tanPhiOld.assign(size, b.tanInitial);
    }
    void Stage(double step) { CalcBreakingBW(b, line, step, eta.data(), rate.data(), d, h); }
};

// The toe is where the face is steeper than the angle; the roller covers
// the face from the toe up to where the surface drops under the line of
// the angle through the toe, never thicker than the surface above the toe,
// and carries the celerity 1.3 sqrt(g d) one node beyond on either side.
TEST(CalcBreakingBW, RollerOnASteepFrontFace) {
    RollerCase c(200, 150);
    c.Stage(0.1);
    EXPECT_DOUBLE_EQ(c.b.slope[149], -0.5);
    EXPECT_DOUBLE_EQ(c.b.slope[150], 0.0);
    int32_t first = 0, last = 0;
    for (int32_t k = 1; k <= 200; ++k)
        if (c.b.delta[k] > 0.0) {
            if (first == 0) first = k;
            last = k;
        }
    EXPECT_EQ(last, 149) << "j0 = toe - 1 for a toe left of node 150";
    ASSERT_GT(first, 0);
    EXPECT_LT(first, 140) << "the roller reaches the plateau";
    EXPECT_GT(first, 125);
    for (int32_t k = first; k <= last; ++k) {
        EXPECT_GT(c.b.delta[k], 0.0) << k;
        EXPECT_LT(c.b.delta[k], c.eta[k]) << k;
    }
    const double c0 = 1.3 * std::sqrt(9.81 * 10.0);
    EXPECT_EQ(c.b.celerity[first - 2], 0.0);
    EXPECT_NEAR(c.b.celerity[first - 1], c0, 1e-12);
    EXPECT_NEAR(c.b.celerity[150], c0, 1e-12);
    EXPECT_EQ(c.b.celerity[151], 0.0);

    // The same front below node 100, and on a line of 100 nodes: no roller.
    for (RollerCase other : {RollerCase(200, 90), RollerCase(100, 95)}) {
        other.Stage(0.1);
        for (double delta : other.b.delta) EXPECT_EQ(delta, 0.0);
    }
    // A front face less steep than the angle: no roller.
    RollerCase gentle(200, 150);
    for (int32_t i = 1; i < 150; ++i) gentle.eta[i] = 0.2 * (150 - i);
    gentle.Stage(0.1);
    for (double delta : gentle.b.delta) EXPECT_EQ(delta, 0.0);
}

// A roller of the last step relaxes its angle towards the final one: a
// stage of half_time / ln 2 reaches it, and the node to the right takes the
// same angle; nodes without a roller start from the initial angle.
TEST(CalcBreakingBW, AngleRelaxesAndMovesRight) {
    RollerCase c(200, 150);
    c.Stage(0.1);
    SaveBreakingBW(c.b);
    EXPECT_EQ(c.b.deltaOld, c.b.delta);
    EXPECT_GT(c.b.deltaOld[149], 0.0);
    c.b.halfTime = 2.0;
    c.Stage(2.0 / std::log(2.0));
    EXPECT_NEAR(c.b.tanPhi[149], c.b.tanFinal, 1e-12);
    EXPECT_NEAR(c.b.tanPhi[150], c.b.tanFinal, 1e-12);
    EXPECT_EQ(c.b.tanPhi[151], c.b.tanInitial);
    c.Stage(1.0);
    const double half = c.b.tanInitial + (c.b.tanFinal - c.b.tanInitial) * std::log(2.0) / 2.0;
    EXPECT_NEAR(c.b.tanPhi[149], half, 1e-12);
}

// The mesh data reader takes the item asked for on the mesh's nodes and
// refuses a file of other points, an item it does not hold and a file that
// is not there.
TEST(ReadNodeMapBW, ItemOnTheNodesOfTheMesh) {
    bwtest::TempDir dir;
    bwtest::WriteLineFile(dir / "map.xol1", "2004-01-01 00:00:00", 1.0, 1.0f,
                          {{{1.0f, 2.0f, 3.0f}}, {{4.0f, 5.0f, 6.0f}}});
    Mesh line;
    AllocateMesh(line, 3, 2, 2, "test");
    testing::internal::CaptureStdout();
    EXPECT_EQ(ReadNodeMapBW(dir / "map.xol1", 2, line), (std::vector<double>{0.0, 4.0, 5.0, 6.0}));
    testing::internal::GetCapturedStdout();
    // The stop is written to the screen: here onto standard error, where the
    // death test reads it.
    EXPECT_EXIT((dup2(2, 1), ReadNodeMapBW(dir / "map.xol1", 3, line)), testing::ExitedWithCode(1),
                "Wrong data file");
    EXPECT_EXIT((dup2(2, 1), ReadNodeMapBW(dir / "none.xol1", 1, line)), testing::ExitedWithCode(1),
                "Illegal data file");
    Mesh longer;
    AllocateMesh(longer, 4, 3, 2, "test");
    EXPECT_EXIT((dup2(2, 1), ReadNodeMapBW(dir / "map.xol1", 1, longer)),
                testing::ExitedWithCode(1), "Wrong data file");
    // A map of the grid model given to a profile.
    bwtest::MapSpec grid;
    grid.J = 2, grid.K = 1;
    bwtest::WriteMapFile(dir / "map.xol2", grid, bwtest::Constant(grid, 1.0f));
    EXPECT_EXIT((dup2(2, 1), ReadNodeMapBW(dir / "map.xol2", 1, line)), testing::ExitedWithCode(1),
                "Wrong dimension");
}

// A line of n nodes 1 m apart and its quadratic refinement.
void Lines(int32_t n, Mesh& line, Mesh& fine) {
    AllocateMesh(line, n, n - 1, 2, "test");
    for (int32_t i = 1; i <= n; ++i) line.x[i] = i - 1.0;
    for (int32_t e = 1; e < n; ++e) {
        line.ElementNodes[line.ElementStart[e]] = e;
        line.ElementNodes[line.ElementStart[e] + 1] = e + 1;
    }
    RefineMesh(line, fine);
}

// The element means of a map (2 and 5 here) on the linear and on the
// quadratic nodes.
TEST(SpongeAndFilter, MapsSpreadByElementMeans) {
    Mesh line, fine;
    Lines(3, line, fine);
    const std::vector<double> s = {0.0, 1.0, 3.0, 7.0};
    EXPECT_EQ(SpreadByElementsBW(s, line, line), (std::vector<double>{0.0, 2.0, 3.5, 5.0}));
    EXPECT_EQ(SpreadByElementsBW(s, line, fine),
              (std::vector<double>{0.0, 2.0, 2.0, 3.5, 5.0, 5.0}));
}

// The sponge scales the flux and relaxes the surface towards the reference
// of its half of the line; the filter spreads a spike over its
// neighbours, and leaves the ends and a node of coefficient 0 alone.
TEST(SpongeAndFilter, AppliedToTheStateVector) {
    BwModel model;
    model.ElevationStart = 4;  // P at y[1..3], eta at y[4..8]
    model.spongeVelocity = {0.0, 0.5, 1.0, 0.25};
    model.spongeElevation = {0.0, 0.5, 1.0, 0.5, 0.5, 1.0};
    model.spongeReference[0] = 1.0;  // the second stays 0: one value in the file
    std::vector<double> y = {9.0, 2.0, 2.0, 2.0, 3.0, 3.0, 3.0, 3.0, 3.0};
    ApplySpongeBW(model, y);
    EXPECT_EQ(y, (std::vector<double>{9.0, 1.0, 2.0, 0.5, 2.0, 3.0, 1.5, 1.5, 3.0}));

    model.filterVelocity = {0.0, 1.0, 1.0, 1.0};
    model.filterElevation = {0.0, 1.0, 1.0, 1.0, 0.0, 1.0};
    y = {9.0, 4.0, 0.0, 4.0, 0.0, 0.0, 1.0, 0.0, 0.0};
    ApplyFilterBW(model, y);
    EXPECT_EQ(y, (std::vector<double>{9.0, 4.0, 2.0, 4.0, 0.0, 0.25, 0.5, 0.0, 0.0}));
}

}  // namespace
