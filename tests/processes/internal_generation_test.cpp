// The setup of internal generation: the points of a line, their numbers in
// the source map, the line files that feed them and the update of the sources.
#include "processes/internal_generation.hpp"

#include <gtest/gtest.h>

#include <cstdlib>
#include <limits>

#include "data/tsfunc.hpp"
#include "input/model_setup.hpp"
#include "solver2d/basin.hpp"
#include "solver2d/model_state.hpp"
#include "support/log_capture.hpp"
#include "support/model_builder.hpp"

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
    void TearDown() override { bwtest::ClearGeneration(); }
    void SetupText(const std::string& records, size_t count) {
        bwtest::SetupFromText(dir,
                              "Internal_Generation {\nNumber_Of_Records = " +
                                  std::to_string(count) + "\n" + records + "}\n",
                              SetupInternalGeneration);
    }
    // A line file for each line, record n holding n at every point (item 2
    // ten times that), and generation set up from them.
    void Setup(const std::vector<Line>& lines, const std::string& fileStart = "2004-01-01 00:00:00",
               double step = 1.0, int records = 10) {
        std::string text;
        for (size_t i = 0; i < lines.size(); ++i) {
            const Line& l = lines[i];
            const std::string name = "line" + std::to_string(i + 1) + ".xol1";
            std::vector<std::vector<float>> items(l.items);
            for (int n = 0; n < records; ++n)
                for (int it = 0; it < l.items; ++it)
                    items[it].push_back((it == 0 ? 1.0f : 10.0f) * n);
            bwtest::WriteUniformLineFile(dir / name, fileStart, step, 1.0f, l.points, items);
            text += bwtest::GenerationRecord(i + 1, l.j1, l.k1, l.j2, l.k2, 1, name);
        }
        SetupText(text, lines.size());
    }
    int32_t Number(int32_t j, int32_t k) { return gGeneration.sourceIndex[gGrid.At(j, k)]; }
    float P(int32_t j, int32_t k) { return gGeneration.sourceP[Number(j, k)]; }
    float Q(int32_t j, int32_t k) { return gGeneration.sourceQ[Number(j, k)]; }
};

TEST_F(Generation, EveryKindOfLineNumbersItsPointsAndNeighboursAndReadsItsFile) {
    // Along k given high end first (feeds x: the east neighbour), along j
    // (feeds y: the north neighbour), a single point (both) and an oblique
    // line (no neighbour, rounded onto the grid); records every 2 s from 3 s
    // before the start.
    gEquation.deepWaterTerms = true;
    Setup({{10, 20, 10, 5, 16}, {3, 2, 6, 2, 4}, {5, 5, 5, 5, 1}, {15, 5, 25, 10, 11}},
          "2003-12-31 23:59:57", 2.0);
    gEquation.deepWaterTerms = false;
    // (j, k, number): ends, neighbours, the oblique rounding; 0 beyond an
    // end, beside a line and beside a single point.
    const int numbers[][3] = {
        {10, 20, 1},  {11, 20, 2}, {10, 5, 31}, {11, 5, 32}, {3, 2, 33},  {3, 3, 34},  {6, 2, 39},
        {6, 3, 40},   {5, 5, 41},  {6, 5, 42},  {5, 6, 43},  {15, 5, 44}, {16, 6, 45}, {17, 6, 46},
        {25, 10, 54}, {10, 21, 0}, {9, 10, 0},  {12, 10, 0}, {7, 2, 0},   {4, 5, 0},   {16, 5, 0}};
    for (const auto& [j, k, n] : numbers) EXPECT_EQ(Number(j, k), n) << j << "," << k;
    EXPECT_EQ(gGeneration.sourceCount, 54);
    // The records around the start (1 s before, 1 s after); item 2 read with
    // the deep-water terms.
    const InternalLineFile& l = gGeneration.lineFiles[1];
    EXPECT_DOUBLE_EQ(l.olderTime, -1.0);
    EXPECT_EQ(l.older, std::vector<float>(4, 1.0f));
    EXPECT_EQ(l.newer, std::vector<float>(4, 2.0f));
    EXPECT_EQ(l.deepNewer, std::vector<float>(4, 20.0f));
}

TEST_F(Generation, WrongLineFilesStopTheRunAndOneThatReachesTheLastStepIsTaken) {
    setenv("TRF", "HUD", 1);
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 5}}), testing::ExitedWithCode(1),
                "XOL data does not have the correct number of grid points \\(x.dir.\\)");
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 4, 1}}), testing::ExitedWithCode(1),
                "XOL data does not contain the correct number of items");
    bwtest::WriteSeriesFile(dir / "series.xol0", "2004-01-01 00:00:00", 1.0,
                            {std::vector<float>(10, 0.0f), std::vector<float>(10, 0.0f)});
    EXPECT_EXIT(SetupText(bwtest::GenerationRecord(1, 10, 5, 10, 8, 1, "series.xol0"), 1),
                testing::ExitedWithCode(1), "XOL data is not 1D");
    // The y half of the last of 10 steps of 0.5 s asks for 5 s: records every
    // 0.5 s need 11 of them, and a file a second late misses the start.
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 4}}, "2004-01-01 00:00:00", 0.5, 10),
                testing::ExitedWithCode(1), "XOL data does not cover the simulation period");
    EXPECT_EXIT(Setup({{10, 5, 10, 8, 4}}, "2004-01-01 00:00:01", 0.5, 20),
                testing::ExitedWithCode(1), "XOL data does not cover the simulation period");
    unsetenv("TRF");

    Setup({{10, 5, 10, 8, 4}}, "2004-01-01 00:00:00", 0.5, 11);
    EXPECT_EQ(gGeneration.lineFiles[0].records, 11);
    bwtest::ClearGeneration();
    // 33 steps of 0.1 s against 11 of 0.3 s differ in the last bit
    // (3.3000000000000003 against 3.3): the file still covers the run.
    gGrid.dt = 0.1, gGrid.timeStepCount = 33;
    Setup({{10, 5, 10, 8, 4}}, "2004-01-01 00:00:00", 0.3, 12);
    EXPECT_EQ(gGeneration.lineFiles[0].records, 12);
}

// A value that is not a finite number in a line file stops the setup with
// the file, the item, the step and the point, at any record the run will
// read; item 2 is read only with the deep water terms, and records after the
// end of the run may hold anything.
TEST_F(Generation, ValuesThatAreNoNumbersInALineFileStopTheSetup) {
    const float nan = std::numeric_limits<float>::quiet_NaN();
    // Ten records of 1 s for 10 steps of 0.5 s: records 0 to 5 are read.
    auto write = [&](const std::string& name, int item, int record) {
        std::vector<std::vector<std::vector<float>>> v(
            2, std::vector<std::vector<float>>(10, std::vector<float>(4, 1.0f)));
        v[item][record][3] = nan;
        bwtest::WriteLineFile(dir / name, "2004-01-01 00:00:00", 1.0, 1.0f, v);
        SetupText(bwtest::GenerationRecord(1, 10, 5, 10, 8, 1, name), 1);
    };
    setenv("TRF", "HUD", 1);
    EXPECT_EXIT(write("main.xol1", 0, 5), testing::ExitedWithCode(1),
                "XOL data holds a value that is not a finite number: .*main.xol1, item 1 \"Item "
                "1\", step 5, point 3\n");
    gEquation.deepWaterTerms = true;
    EXPECT_EXIT(write("deep.xol1", 1, 0), testing::ExitedWithCode(1),
                "deep.xol1, item 2 \"Item 2\", step 0, point 3\n");
    gEquation.deepWaterTerms = false;
    unsetenv("TRF");
    write("deep.xol1", 1, 0);
    bwtest::ClearGeneration();
    write("after.xol1", 0, 8);
    EXPECT_EQ(gGeneration.lineFiles[0].newer, std::vector<float>(4, 1.0f));
}

TEST_F(Generation, TheUpdateFeedsEachKindOfLineAtTheMiddleAndTheEndOfTheStep) {
    // A line along k fed by a constant series (0.4, deep item 4); a line along
    // j, high end first, and an oblique line, both fed by files of one record
    // a second whose point s at record n holds n + 0.1 s (deep item ten times
    // that); steps of 0.5 s.
    gEquation.deepWaterTerms = true;
    TsReset();
    TsInit(gGrid.timeStepCount + 1);
    bwtest::WriteSeriesFile(dir / "c.xol0", "2004-01-01 00:00:00", 0.5,
                            {std::vector<float>(11, 0.4f), std::vector<float>(11, 4.0f)});
    for (const auto& [name, points] : {std::pair{"down.xol1", 4}, std::pair{"oblique.xol1", 11}}) {
        std::vector<std::vector<std::vector<float>>> items(2);
        for (int n = 0; n < 6; ++n) {
            std::vector<float> v(points);
            for (int s = 0; s < points; ++s) v[s] = n + 0.1f * s;
            items[0].push_back(v);
            for (float& x : v) x *= 10.0f;
            items[1].push_back(v);
        }
        bwtest::WriteLineFile(dir / name, "2004-01-01 00:00:00", 1.0, 1.0f, items);
    }
    SetupText(bwtest::GenerationRecord(1, 2, 2, 2, 4, 0, "c.xol0") +
                  bwtest::GenerationRecord(2, 8, 3, 5, 3, 1, "down.xol1") +
                  bwtest::GenerationRecord(3, 15, 5, 25, 10, 1, "oblique.xol1"),
              3);
    const GenerationState& g = gGeneration;
    auto obliqueIsEmpty = [&] {
        for (int32_t i = 15; i <= g.sourceCount; ++i)
            if (g.sourceP[i] != 0.0f || g.sourceQ[i] != 0.0f) return false;
        return true;
    };
    // Step 1: the series gives half its value at the x half, all of it at the
    // y half; the file is read at 0.5 s for the y half, s = 0 at the high end
    // (8,3), and both rows of the line take the value.
    TsReadStep(1);
    UpdateInternalGeneration(1, 1);
    EXPECT_FLOAT_EQ(P(2, 2), 0.2f);
    EXPECT_FLOAT_EQ(P(3, 4), 0.2f);
    EXPECT_EQ(Q(8, 3), 0.0f);
    // The deep items feed every half step, each line its own direction.
    EXPECT_FLOAT_EQ(g.sourceXiX[Number(2, 3)], 2.0f);
    EXPECT_FLOAT_EQ(g.sourceXiY[Number(8, 3)], 2.5f);
    EXPECT_EQ(g.sourceXiY[Number(2, 3)], 0.0f);
    EXPECT_EQ(g.sourceXiX[Number(8, 3)], 0.0f);
    UpdateInternalGeneration(1, 2);
    EXPECT_FLOAT_EQ(P(2, 2), 0.2f);  // x keeps its value through the y half
    EXPECT_FLOAT_EQ(g.sourceXiX[Number(2, 3)], 4.0f);
    EXPECT_FLOAT_EQ(Q(8, 3), 0.5f);
    EXPECT_FLOAT_EQ(Q(8, 4), 0.5f);
    EXPECT_FLOAT_EQ(Q(5, 3), 0.8f);
    EXPECT_FLOAT_EQ(Q(5, 4), 0.8f);
    EXPECT_FLOAT_EQ(g.sourceXiY[Number(6, 4)], 7.0f);
    EXPECT_EQ(Q(2, 2), 0.0f);  // a line along k never feeds y
    EXPECT_TRUE(obliqueIsEmpty());
    // Steps 2 and 3: the series stands at its value; the file passes its
    // second record at 1 s and is interpolated beyond it; the levels shift.
    for (int32_t n = 2; n <= 3; ++n) {
        TsReadStep(n);
        UpdateInternalGeneration(n, 1);
        UpdateInternalGeneration(n, 2);
    }
    EXPECT_FLOAT_EQ(P(2, 2), 0.4f);
    EXPECT_FLOAT_EQ(g.sourcePPrev[Number(2, 2)], 0.4f);
    EXPECT_FLOAT_EQ(g.sourcePPrev2[Number(2, 2)], 0.2f);
    EXPECT_FLOAT_EQ(Q(7, 3), 1.6f);
    EXPECT_FLOAT_EQ(g.sourceQPrev[Number(7, 3)], 1.1f);
    EXPECT_FLOAT_EQ(g.sourceQPrev2[Number(7, 3)], 0.6f);
    EXPECT_TRUE(obliqueIsEmpty());
}

}  // namespace
