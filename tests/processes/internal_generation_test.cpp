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
        g.dt = 0.5, g.timeStepCount = 10, g.lastStep = 9;
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
    gEquation.deepWaterTerms = true;
    Setup({{10, 20, 10, 5, 16}, {3, 2, 6, 2, 4}, {5, 5, 5, 5, 1}, {15, 5, 25, 10, 11}},
          "2003-12-31 23:59:57", 2.0);
    gEquation.deepWaterTerms = false;
    // (j, k, number): the ends of each line and their neighbours, the
    // oblique line's rounding; 0 beyond an end, beside a line and beside a
    // single point.
    const int numbers[][3] = {
        {10, 20, 1},  {11, 20, 2}, {10, 5, 31}, {11, 5, 32}, {3, 2, 33},  {3, 3, 34},  {6, 2, 39},
        {6, 3, 40},   {5, 5, 41},  {6, 5, 42},  {5, 6, 43},  {15, 5, 44}, {16, 6, 45}, {17, 6, 46},
        {25, 10, 54}, {10, 21, 0}, {9, 10, 0},  {12, 10, 0}, {7, 2, 0},   {4, 5, 0},   {16, 5, 0}};
    for (const auto& [j, k, n] : numbers) EXPECT_EQ(Number(j, k), n) << j << "," << k;
    EXPECT_EQ(gGeneration.sourceCount, 54);

    // A line file starts with the records around the start: the older one
    // 1 s before it, the newer 1 s after it; item 2 is read with the
    // deep-water terms.
    const InternalLineFile& l = gGeneration.lineFiles[1];
    EXPECT_DOUBLE_EQ(l.olderTime, -1.0);
    EXPECT_EQ(l.older, std::vector<float>(4, 1.0f));
    EXPECT_EQ(l.newer, std::vector<float>(4, 2.0f));
    EXPECT_EQ(l.deepNewer, std::vector<float>(4, 20.0f));
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
    unsetenv("TRF");
}

}  // namespace
