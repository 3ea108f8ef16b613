// The model reader in-process on small complete model files: what the grid,
// the equations, the process records and the start state hold afterwards.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <limits>

#include "data/tsfunc.hpp"
#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "processes/friction.hpp"
#include "processes/porosity.hpp"
#include "run/progress.hpp"
#include "run/units.hpp"
#include "solver2d/model_state.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;

// A 6 x 4 grid of 2 m by 3 m: bed -1 - j/10 in the water, land (bed 1) along
// k = 3, and one point exactly at the land value 0.5.
std::vector<float> Bed() {
    std::vector<float> bed(7 * 5);
    for (int k = 0; k <= 4; ++k)
        for (int j = 0; j <= 6; ++j) bed[k * 7 + j] = k == 3 ? 1.0f : -1.0f - 0.1f * j;
    bed[2 * 7 + 4] = 0.5f;
    return bed;
}

// A map file of several items, item n holding base + n at every point; the
// item `bad`, if any, holds `value` at (5,0).
void WriteItems(const std::string& path, const bwtest::MapSpec& grid, int items, float base,
                int dataType = 0, int bad = 0, float value = 0.0f) {
    XolFile f = XolCreateHeader("Test map", items, 2);
    for (int n = 1; n <= items; ++n) XolSetItem(f, n, 100079, "Item " + std::to_string(n), 1000);
    XolSetAxis(f, 1, grid.dx, 0.0f, grid.J + 1);
    XolSetAxis(f, 2, grid.dy, 0.0f, grid.K + 1);
    XolSetCalendarAxis(f, 1.0, "2000-01-01 00:00:00");
    XolSetDataType(f, dataType);
    XolSetProjection(f, "NON-UTM", 0.0, 0.0, 0.0);
    XolCreateFile(f, path);
    std::vector<float> v(static_cast<size_t>(grid.J + 1) * (grid.K + 1));
    for (int n = 1; n <= items; ++n) {
        std::fill(v.begin(), v.end(), base + n);
        if (n == 2 && dataType == 11) v = Bed();  // a state file holds the bed as item 2
        if (n == bad) v[5] = value;
        XolWriteDynamic(f, v.data());
    }
    XolClose(f);
}

class ModelReader : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    KvtHandle file = 0;
    void SetUp() override {
        grid.J = 6, grid.K = 4, grid.dx = 2.0f, grid.dy = 3.0f;
        bwtest::WriteMapFile(dir / "bed.xol2", grid, Bed());
        ResetModelState();
        TsReset();
        setenv("TRF", "HUD", 1);  // stop texts go to standard error, where death tests read them
    }
    void TearDown() override {
        unsetenv("TRF");
        if (file != 0) kvtClose(&file);
        if (gKvtAccess.logUnit > 0) ReleaseUnit(gKvtAccess.logUnit);
        gKvtAccess = KvtAccessState{};
        TsReset();
    }
    // Writes the model with the given sections and reads it, with a log.
    void Read(const Sections& sections, const std::string& bathymetry = "bed.xol2") {
        bwtest::WriteFile(dir / "m.bw", bwtest::ModelText(bathymetry, sections));
        file = KvtOpenFile(dir / "m.bw", true);
        ReadModelSetup(file, dir / "m.bw");
    }
    std::string Log() {
        FlushUnits();
        return bwtest::ReadFile(dir / "m.log");
    }
    float At(const Field& f, int j, int k) { return f[gGrid.At(j, k)]; }
};

TEST_F(ModelReader, ReferenceLevelShiftPeriodAndAColdStart) {
    Read({{"Area_Description", "True_land_value = 0.5\nReference_Level_Shift = 1\n"},
          {"Simulation_Period",
           "Time_step_count = 20\nTime_step_interval = 0.25\n"
           "Warm_up_period = 4\nStart_time = 2004, 2, 29, 23, 59, 30\n"},
          {"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0.5\n"}});
    const GridState& g = gGrid;
    // Water points are lowered by 1; land, down to the land value, is not.
    EXPECT_FLOAT_EQ(At(g.bed, 2, 1), -2.2f);
    EXPECT_EQ(At(g.bed, 4, 2), 0.5f);
    EXPECT_EQ(g.waterPoints, 7 * 4 - 1);
    // The period reaches the grid, the progress channel (its clock after 120
    // steps) and the series store (steps 0..20).
    EXPECT_EQ(DateTimeText(g.start), "2004-02-29 23:59:30");
    EXPECT_EQ(DateTimeText(AddSeconds(gProgress.simulationStart, 120 * gProgress.timeStep)),
              "2004-03-01 00:00:00");
    EXPECT_EQ(gTs.tsSteps, 21);
    // The cold start puts its one level over water and land alike.
    for (auto [j, k] : {std::pair{2, 1}, {2, 3}}) {
        for (const Field* f : {&g.xi, &g.xiPrev, &g.xiPrev2}) EXPECT_EQ(At(*f, j, k), 0.5f);
        EXPECT_FLOAT_EQ(At(g.depth, j, k), 0.5f - At(g.bed, j, k));
    }
}

// Without the deep water terms B is 0 and the dispersive terms are centred
// in time, whatever the file says (the log keeps what it says); with them B
// may reach either end of its range.
TEST_F(ModelReader, EquationSettingsAndTheirForcedValues) {
    const struct {
        const char *deep, *b;
        float factor, lower;  // in force
    } cases[] = {{"false", "5", 0.0f, 1.0f},
                 {"true", "-0.333", -0.333f, 0.3f},
                 {"true", "0.166", 0.166f, 0.3f}};
    for (const auto& c : cases) {
        Read({{"Equation_Parameters",
               std::string("Deep_Water_Terms = ") + c.deep + "\nDispersion_Factor = " + c.b + "\n"},
              {"SOLUTION_PARAMETERS", "Time_extrapolation_factor_lower = 0.3\n"}});
        EXPECT_EQ(gEquation.dispersionFactor, c.factor) << c.b;
        EXPECT_EQ(gEquation.extrapolationLower, c.lower) << c.b;
        EXPECT_NE(Log().find(std::string(" Dispersion_Factor : ") + c.b + "\n"), std::string::npos);
        kvtClose(&file);
        ResetModelState();
        TsReset();
    }
}

TEST_F(ModelReader, ProcessSettingsOverTheSelectedItemOfTheBathymetry) {
    bwtest::WriteMapFile(dir / "por.xol2", grid, bwtest::Constant(grid, 0.5f));
    WriteItems(dir / "three.xol2", grid, 4, -10.0f);
    Read({{"Bathymetry_Selection",
           "DATA_FILE {\nFile_name = file(\"three.xol2\")\nItem_Count = 1\nItem_Numbers = 3\n}\n"},
          {"MOVING_SHORELINE", "type = 1\ndepth = -12\nwidth = 0.02\n"},
          {"Bottom_Friction", "Resistance_Type = 1\nFormulation = 1\nConstant_Value = 40\n"},
          {"EDDY_VISCOSITY", "Type = 1\nFormulation = 0\nBase = 0\nConstant_Value = 0.3\n"},
          {"Porosity", "Porosity_Type = true\nParticle_Diameter = 0.1\n" +
                           bwtest::DataFileSection("por.xol2")}});
    EXPECT_EQ(gFriction.frictionConstant, 9.81f / 1600.0f);
    EXPECT_EQ(gEddy.eddyType, -1);  // base 0: the sweeps act as if it were off
    EXPECT_FLOAT_EQ(gPorosity.alpha, 1.4e-06f * 1000.0f / 0.01f);
    // Item 3 of the bathymetry file is the bed, 7 m deep. The slot (its type,
    // depth and width as read) reaches the initial depth: above the bed it
    // adds its cross-section.
    EXPECT_EQ(At(gGrid.bed, 5, 2), -7.0f);
    const double hs = -7.0 + 12.0;
    const double slot = hs * ((1 - std::exp(-100.0)) * 0.98 / 100.0 + 0.02);
    EXPECT_NEAR(At(gGrid.depth, 2, 1), 7.0 + slot, 1e-5);
}

TEST_F(ModelReader, AHotStartReadsTheStateAndNeedsNoSurfaceSection) {
    WriteItems(dir / "hot.xol2", grid, 18, 100.0f, 11);
    Read({{"Bathymetry_Selection", "Hot_Start = true\n" + bwtest::DataFileSection("hot.xol2")},
          {"SURFACE_ELEVATION", "-"}});
    const GridState& g = gGrid;
    EXPECT_EQ(g.bed, Bed());
    // Items 3 to 10 in file order; xiPrev2 is not in the file.
    const Field* fields[] = {&g.xi, &g.P, &g.Q, &g.xiPrev, &g.QPrev, &g.qxyt, &g.xiPrev2};
    const float values[] = {103.0f, 104.0f, 105.0f, 106.0f, 108.0f, 110.0f, 1e-10f};
    for (int i = 0; i < 7; ++i) EXPECT_EQ(At(*fields[i], 1, 1), values[i]) << values[i];
    EXPECT_FLOAT_EQ(At(g.depth, 1, 1), 103.0f + 1.1f);
    EXPECT_EQ(Log().find("SURFACE_ELEVATION"), std::string::npos);
}

using ModelReaderDeathTest = ModelReader;

TEST_F(ModelReaderDeathTest, BadFilesStopWithTheirMessage) {
    // Axes of spacing 0 or falling: the corpus of bad input (tests/system).
    bwtest::MapSpec bare = grid, bogus = grid, wide = grid;
    bare.projection = "", bogus.projection = "NO-SUCH-FRAME", wide.J = 7;
    bwtest::WriteMapFile(dir / "bare.xol2", bare, Bed());
    bwtest::WriteMapFile(dir / "bogus.xol2", bogus, Bed());
    bwtest::WriteMapFile(dir / "wide.xol2", wide, bwtest::Constant(wide, 1.0f));
    bwtest::WriteSeriesFile(dir / "series.xol0", "2004-01-01 00:00:00", 1.0, {{0.0f, 1.0f}});
    auto with = [](const char* section, const char* type, const char* file) {
        return Sections{{section, std::string(type) + " = true\n" + bwtest::DataFileSection(file)}};
    };
    const struct {
        Sections sections;
        const char *bathymetry, *message;
    } cases[] = {
        {with("Bathymetry_Selection", "Hot_Start", "bed.xol2"), "bed.xol2",
         "XOL data is not hot start data"},
        {{}, "absent.xol2", "XOL file can not be opened: .*absent.xol2: no such file or directory"},
        {{}, "bare.xol2", "XOL data does not contain projection information"},
        {{}, "bogus.xol2", "Unable to initialize the cartography module"},
        {with("Sponge", "Sponge_Type", "series.xol0"), "bed.xol2",
         "ERR_XOL_NOT2D: .*series.xol0: it has 0 spatial axes where a map has 2"},
        {with("Sponge", "Sponge_Type", "wide.xol2"), "bed.xol2",
         "XOL data does not have the correct number of grid points \\(x.dir.\\)"},
    };
    for (const auto& c : cases)
        EXPECT_EXIT(Read(c.sections, c.bathymetry), testing::ExitedWithCode(1), c.message);
}

// A value that is not a finite number in a state file stops the setup with
// the file, the item and the place: in its bed and in the items the surface
// and the generation read. The bed and the maps of a cold start: the corpus
// of bad input (tests/system).
TEST_F(ModelReaderDeathTest, ValuesThatAreNoNumbersStopNamingFileItemAndPlace) {
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const float inf = std::numeric_limits<float>::infinity();
    WriteItems(dir / "hot6.xol2", grid, 18, 100.0f, 11, 6, inf);
    WriteItems(dir / "hot2.xol2", grid, 18, 100.0f, 11, 2, nan);
    WriteItems(dir / "hot16.xol2", grid, 18, 100.0f, 11, 16, nan);
    const std::string hot = "Hot_Start = true\n";
    const std::string generation =
        "Number_Of_Records = 1\n" + bwtest::GenerationRecord(1, 1, 1, 1, 2, 0, "series.xol0");
    bwtest::WriteSeriesFile(dir / "series.xol0", "2004-01-01 00:00:00", 1.0,
                            {std::vector<float>(4, 0.0f), std::vector<float>(4, 0.0f)});
    const struct {
        Sections sections;
        const char *bathymetry, *message;
    } cases[] = {
        {{{"Bathymetry_Selection", hot + bwtest::DataFileSection("hot2.xol2")},
          {"SURFACE_ELEVATION", "-"}},
         "hot2.xol2",
         "hot2.xol2, item 2 \"Item 2\", point \\(5,0\\)"},
        {{{"Bathymetry_Selection", hot + bwtest::DataFileSection("hot6.xol2")},
          {"SURFACE_ELEVATION", "-"}},
         "hot6.xol2",
         "hot6.xol2, item 6 \"Item 6\", point \\(5,0\\)"},
        {{{"Bathymetry_Selection", hot + bwtest::DataFileSection("hot16.xol2")},
          {"SURFACE_ELEVATION", "-"},
          {"Internal_Generation", generation}},
         "hot16.xol2",
         "hot16.xol2, item 16 \"Item 16\", point \\(5,0\\)"},
    };
    for (const auto& c : cases)
        EXPECT_EXIT(Read(c.sections, c.bathymetry), testing::ExitedWithCode(1),
                    std::string("XOL data holds a value that is not a finite number: .*") +
                        c.message + "\n")
            << c.message;
}

}  // namespace
