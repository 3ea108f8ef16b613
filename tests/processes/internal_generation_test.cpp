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

TEST_F(Generation, EveryKindOfLineNumbersItsPointsAndNeighboursAndReadsItsFile) {
    // Along k with its ends given high first (feeds x: the east neighbour),
    // along j (feeds y: the north neighbour), a single point (both
    // neighbours) and an oblique line (no neighbour, rounded onto the grid).
    // Their files hold records every 2 s from 3 s before the start.
    const std::vector<Line> lines = {{10, 20, 10, 5, 16}, {3, 2, 6, 2, 4}, {5, 5, 5, 5, 1},
                                     {15, 5, 25, 10, 11}};
    Setup(lines, "2003-12-31 23:59:57", 2.0, 10);
    const auto& r = gGeneration.records;
    const int kinds[4] = {1, 2, 1, 3}, counts[4] = {15, 3, 0, 10};
    for (int i = 0; i < 4; ++i) {
        EXPECT_EQ(LineKind(r[i]), kinds[i]) << i;
        EXPECT_EQ(r[i].pointCount, counts[i]) << i;
    }
    for (int32_t k = 5; k <= 20; ++k) {  // record 1 runs from k = 20 down
        EXPECT_EQ(Number(10, k), 2 * (20 - k) + 1) << k;
        EXPECT_EQ(Number(11, k), 2 * (20 - k) + 2) << k;
    }
    for (int32_t j = 3; j <= 6; ++j) {  // record 2 goes on from 32
        EXPECT_EQ(Number(j, 2), 33 + 2 * (j - 3)) << j;
        EXPECT_EQ(Number(j, 3), 34 + 2 * (j - 3)) << j;
    }
    EXPECT_EQ(Number(5, 5), 41);
    EXPECT_EQ(Number(6, 5), 42);
    EXPECT_EQ(Number(5, 6), 43);
    const int expectedK[11] = {5, 6, 6, 7, 7, 8, 8, 9, 9, 10, 10};
    for (int s = 0; s <= 10; ++s) {
        EXPECT_EQ(r[3].pointJ[s], 15 + s);
        EXPECT_EQ(r[3].pointK[s], expectedK[s]) << s;
        EXPECT_EQ(Number(15 + s, expectedK[s]), 44 + s) << s;
    }
    // Beyond the ends, beside a line and beside a single point: no source.
    for (auto [j, k] : {std::pair{10, 4}, {10, 21}, {9, 10}, {12, 10}, {7, 2}, {4, 5}, {16, 5}})
        EXPECT_EQ(Number(j, k), 0) << j << "," << k;
    EXPECT_EQ(gGeneration.sourceCount, 54);
    EXPECT_EQ(gGeneration.sourceP.size(), 55u);  // element 0 unused

    // A line file starts with the records around the start: the older one
    // 1 s before it, the newer 1 s after it. Item 2 is passed over without
    // the deep-water terms and read with them.
    for (bool deep : {false, true}) {
        if (deep) {
            TearDown();
            gEquation.deepWaterTerms = true;
            Setup(lines, "2003-12-31 23:59:57", 2.0);
        }
        const InternalLineFile& l = gGeneration.lineFiles[1];
        EXPECT_DOUBLE_EQ(l.olderTime, -1.0);
        EXPECT_DOUBLE_EQ(l.fileStep, 2.0);
        EXPECT_EQ(l.older, std::vector<float>(4, 1.0f));
        EXPECT_EQ(l.newer, std::vector<float>(4, 2.0f));
        EXPECT_EQ(l.deepNewer, deep ? std::vector<float>(4, 20.0f) : std::vector<float>{});
        EXPECT_EQ(gGeneration.sourceXiY.size(), deep ? 55u : 0u);
    }
    gEquation.deepWaterTerms = false;
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
