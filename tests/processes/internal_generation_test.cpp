// The setup of internal generation: the points of a line, their numbers in
// the source map, and the line files that feed them.
#include "processes/internal_generation.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <sstream>

#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

struct Line {
    int j1, k1, j2, k2;
    int points;  // values per record of its line file
    int items = 2;
};

class Generation : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::LogCapture log;
    void SetUp() override {
        ResetModelState();
        gBasic = BasicSettings{};
        GridState& g = gGrid;
        g.J = 30, g.K = 25, g.dx = g.dy = 1.0f;
        g.dt = 0.5;
        g.timeStepCount = 10;
        g.lastStep = 9;
        g.start = MakeDateTime(2004, 1, 1, 0, 0, 0);
    }
    void TearDown() override {
        for (InternalLineFile& l : gGeneration.lineFiles)
            if (l.file.mode == 1) XolClose(l.file);
        gGeneration = GenerationState{};
    }
    // Writes a line file for each line (record n holds the value n at every
    // point, item 2 ten times that) and sets up generation from them.
    void Setup(const std::vector<Line>& lines, const std::string& fileStart = "2004-01-01 00:00:00",
               double step = 1.0, int records = 10) {
        std::ostringstream s;
        s << "TARNEL_BOUSSINESQ_WAVE {\nInternal_Generation {\nNumber_Of_Records = " << lines.size()
          << "\n";
        for (size_t i = 0; i < lines.size(); ++i) {
            const Line& l = lines[i];
            const std::string name = "line" + std::to_string(i + 1) + ".xol1";
            std::vector<std::vector<std::vector<float>>> items(l.items);
            for (int it = 0; it < l.items; ++it)
                for (int n = 0; n < records; ++n)
                    items[it].push_back(std::vector<float>(l.points, (it == 0 ? 1.0f : 10.0f) * n));
            bwtest::WriteLineFile(dir / name, fileStart, step, 1.0f, items);
            s << "INTERNAL_GEN_DATA_" << i + 1 << " {\nFirst_Line_Pos = " << l.j1 << ", " << l.k1
              << "\nLast_Line_Pos = " << l.j2 << ", " << l.k2 << "\nWave_Type = 1\n"
              << bwtest::DataFileSection(name) << "}\n";
        }
        s << "}\n}\n";
        bwtest::WriteFile(dir / "m.bw", s.str());
        KvtHandle file = KvtOpenFile(dir / "m.bw", false);
        SetupInternalGeneration(KvtOpenTarget(file, "TARNEL_BOUSSINESQ_WAVE"));
        kvtClose(&file);
    }
    int32_t Number(int32_t j, int32_t k) { return gGeneration.sourceIndex[gGrid.At(j, k)]; }
};

TEST_F(Generation, ALineAlongKNumbersItsPointsAndTheirEastNeighbours) {
    Setup({{10, 5, 10, 20, 16}});
    const InternalGenRecord& r = gGeneration.records[0];
    EXPECT_EQ(r.pointCount, 15);
    EXPECT_EQ(LineKind(r), 1);
    EXPECT_EQ(gGeneration.sourceCount, 32);
    for (int32_t k = 5; k <= 20; ++k) {
        EXPECT_EQ(Number(10, k), 2 * (k - 5) + 1);
        EXPECT_EQ(Number(11, k), 2 * (k - 5) + 2);
    }
    EXPECT_EQ(Number(10, 4), 0);
    EXPECT_EQ(Number(10, 21), 0);
    EXPECT_EQ(Number(9, 10), 0);
    EXPECT_EQ(gGeneration.sourceP.size(), 33u);  // numbers 1..32, element 0 unused
    EXPECT_TRUE(gGeneration.sourceXiX.empty());  // no deep-water terms
    EXPECT_EQ(gGeneration.genJ2, 30);
    EXPECT_EQ(gGeneration.genK2, 25);
}

TEST_F(Generation, EndsGivenHighFirstRunDownAndLinesAlongJFeedY) {
    Setup({{10, 20, 10, 5, 16}, {3, 2, 6, 2, 4}});
    EXPECT_EQ(gGeneration.records[0].pointK[0], 20);
    EXPECT_EQ(gGeneration.records[0].pointK[15], 5);
    EXPECT_EQ(Number(10, 20), 1);
    EXPECT_EQ(Number(11, 5), 32);
    // The second record goes on from 32, its neighbours one up in k.
    EXPECT_EQ(LineKind(gGeneration.records[1]), 2);
    EXPECT_EQ(Number(3, 2), 33);
    EXPECT_EQ(Number(3, 3), 34);
    EXPECT_EQ(Number(6, 3), 40);
    EXPECT_EQ(gGeneration.sourceCount, 40);
}

TEST_F(Generation, ASinglePointHasThreeNumbersAndAnObliqueLineOneForEachPoint) {
    Setup({{5, 5, 5, 5, 1}, {10, 5, 20, 10, 11}});
    EXPECT_EQ(Number(5, 5), 1);
    EXPECT_EQ(Number(6, 5), 2);
    EXPECT_EQ(Number(5, 6), 3);
    const InternalGenRecord& r = gGeneration.records[1];
    EXPECT_EQ(LineKind(r), 3);
    ASSERT_EQ(r.pointCount, 10);
    const int expectedK[11] = {5, 6, 6, 7, 7, 8, 8, 9, 9, 10, 10};
    for (int s = 0; s <= 10; ++s) {
        EXPECT_EQ(r.pointJ[s], 10 + s);
        EXPECT_EQ(r.pointK[s], expectedK[s]) << s;
        EXPECT_EQ(Number(10 + s, expectedK[s]), 4 + s);
    }
    EXPECT_EQ(gGeneration.sourceCount, 14);
}

TEST_F(Generation, ALineFileStartsWithTheRecordsAroundTheSimulationStart) {
    // Records every 2 s from 3 s before the start: the older one stands
    // 1 s before it, the newer 1 s after it.
    Setup({{10, 5, 10, 8, 4}}, "2003-12-31 23:59:57", 2.0, 10);
    const InternalLineFile& l = gGeneration.lineFiles[0];
    EXPECT_DOUBLE_EQ(l.olderTime, -1.0);
    EXPECT_DOUBLE_EQ(l.fileStep, 2.0);
    EXPECT_EQ(l.older, std::vector<float>(4, 1.0f));
    EXPECT_EQ(l.newer, std::vector<float>(4, 2.0f));
    EXPECT_TRUE(l.deepOlder.empty());  // item 2 passed over without the deep-water terms

    gEquation.deepWaterTerms = true;
    TearDown();
    Setup({{10, 5, 10, 8, 4}}, "2003-12-31 23:59:57", 2.0, 10);
    EXPECT_EQ(gGeneration.lineFiles[0].deepNewer, std::vector<float>(4, 20.0f));
    EXPECT_EQ(gGeneration.sourceXiY.size(), 9u);
}

TEST_F(Generation, AHotStartBringsBackTheSourcesOfItsItems15To18) {
    // A state file whose item n holds 1000 n + i at its i-th value.
    XolFile f = XolCreateHeader("State", 18, 2);
    for (int n = 1; n <= 18; ++n) XolSetItem(f, n, 999, "Item " + std::to_string(n), 0);
    XolSetAxis(f, 1, 1.0f, 0.0f, 31);
    XolSetAxis(f, 2, 1.0f, 0.0f, 26);
    XolSetCalendarAxis(f, 1.0, "2004-01-01 00:00:00");
    XolSetDataType(f, 11);
    XolCreateFile(f, dir / "state.xol2");
    std::vector<float> v(31 * 26);
    for (int n = 1; n <= 18; ++n) {
        for (size_t i = 0; i < v.size(); ++i) v[i] = 1000.0f * n + i;
        XolWriteDynamic(f, v.data());
    }
    XolClose(f);
    gBathymetry.hotStart = true;
    gBathymetry.fileName = dir / "state.xol2";
    Setup({{10, 5, 10, 20, 16}});
    gBathymetry = BathymetrySettings{};
    const GenerationState& s = gGeneration;
    for (int i : {1, 32}) {
        EXPECT_EQ(s.sourceP[i], 15000.0f + i - 1);
        EXPECT_EQ(s.sourceQ[i], 16000.0f + i - 1);
        EXPECT_EQ(s.sourcePPrev[i], 17000.0f + i - 1);
        EXPECT_EQ(s.sourceQPrev[i], 18000.0f + i - 1);
        EXPECT_EQ(s.sourcePPrev2[i], 0.0f);
    }
}

TEST_F(Generation, WrongLineFilesStopTheRun) {
    setenv("TRF", "HUD", 1);
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 5}}), testing::ExitedWithCode(1),
                "XOL data does not have the correct number of grid points \\(x.dir.\\)");
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 4, 1}}), testing::ExitedWithCode(1),
                "XOL data does not contain the correct number of items");
    // The run lasts 4.5 s; a file of 4 records a second from the start ends at 3 s.
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 4}}, "2004-01-01 00:00:00", 1.0, 4),
                testing::ExitedWithCode(1), "XOL data does not cover the simulation period");
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 4}}, "2004-01-01 00:00:01", 1.0, 10),
                testing::ExitedWithCode(1), "XOL data does not cover the simulation period");
    unsetenv("TRF");
}

}  // namespace
