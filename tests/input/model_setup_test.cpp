// The model reader as a user meets it: the engine started on model files
// with one thing wrong stops with that thing's message, and a sound file's
// log records every setting, defaults marked.
#include <gtest/gtest.h>

#include <limits>

#include "data/xolfile.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;

class ModelFile : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::MapSpec grid;
    void SetUp() override {
        grid.J = 8, grid.K = 6;
        // Water of 2 m inside a frame of land.
        std::vector<float> bed = bwtest::Constant(grid, -2.0f);
        for (int k = 0; k <= grid.K; ++k)
            for (int j = 0; j <= grid.J; ++j)
                if (j == 0 || j == grid.J || k == 0 || k == grid.K)
                    bed[k * (grid.J + 1) + j] = 1.0f;
        bwtest::WriteMapFile(dir / "bed.xol2", grid, bed);
    }
    // Runs the engine on the model; gives the exit code and what it printed.
    bwtest::RunResult Run(const Sections& sections, const std::string& bathymetry = "bed.xol2") {
        bwtest::WriteFile(dir / "m.bw", bwtest::ModelText(bathymetry, sections));
        return bwtest::RunProgram({bwtest::BuiltProgram("bw"), "m.bw"}, dir.path.string(),
                                  {{"TARN_PROGRESS", "NONE"}}, {"BUILDMODE", "TRF"});
    }
    // The map of one value on the model's grid, as a DATA_FILE section.
    std::string Map(const std::string& name, float value) {
        bwtest::WriteMapFile(dir / name, grid, bwtest::Constant(grid, value));
        return bwtest::DataFileSection(name);
    }
};

TEST_F(ModelFile, ASoundFileRunsAndItsLogHoldsEverySetting) {
    // Porosity and sponge maps whose frame of land holds values no water
    // point may have: land is not checked.
    std::vector<float> por = bwtest::Constant(grid, 0.1f), sponge = bwtest::Constant(grid, 0.0f);
    for (int k = 1; k < grid.K; ++k)
        for (int j = 1; j < grid.J; ++j)
            por[k * (grid.J + 1) + j] = 0.6f, sponge[k * (grid.J + 1) + j] = 1.0f;
    bwtest::WriteMapFile(dir / "por.xol2", grid, por);
    bwtest::WriteMapFile(dir / "sponge.xol2", grid, sponge);
    const bwtest::RunResult r =
        Run({{"BASIC_MODEL_PARAMETERS", "OPEN_LOG_FILE_AFTER_RUN = 0\n"},
             {"Porosity", "Porosity_Type = true\n" + bwtest::DataFileSection("por.xol2")},
             {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol2")},
             {"Simulation_Period", "Time_step_count = 3\nTime_step_interval = 0.1\n"}});
    ASSERT_EQ(r.exitCode, 0) << r.out;
    // Each kind of value as read, defaults marked.
    const std::string log = bwtest::ReadFile(dir / "m.log");
    for (const char* line :
         {"    NUMBER_OF_DIMENSIONS : 2 (default)\n", "    True_land_value : 0\n",
          "    Start_time : 0 0 0 0 0 0 (default)\n", "    Deep_Water_Terms : False\n",
          "    Name_of_Text_Editor : Notepad.exe (default)\n", "    minimum_depth : -0.02999"})
        EXPECT_NE(log.find(line), std::string::npos) << line;
    // The sections in reading order.
    size_t at = 0;
    for (const char* section :
         {"BASIC_MODEL_PARAMETERS", "Bathymetry_Selection", "Area_Description", "Simulation_Period",
          "Equation_Parameters", "SOLUTION_PARAMETERS", "MOVING_SHORELINE", "Bottom_Friction",
          "WAVE_BREAKING", "EXPLICIT_FILTERING", "EDDY_VISCOSITY", "Porosity", "Sponge",
          "SURFACE_ELEVATION", "Boundary_Location", "Internal_Generation",
          "Output_Deterministic_2D", "OPTION_PARAMETERS"}) {
        at = log.find(std::string("Section: ") + section + " ", at);
        ASSERT_NE(at, std::string::npos) << section;
    }
    // Keys behind a switched-off type are not read.
    EXPECT_EQ(log.find("roller_factor"), std::string::npos);
    EXPECT_EQ(log.find("smoothing_parameter"), std::string::npos);
}

TEST_F(ModelFile, WhatIsMissingOutOfRangeOrNotAvailableStopsWithItsMessage) {
    // A generation line of three points fed by a series of one item.
    bwtest::WriteSeriesFile(dir / "gen.xol0", "2004-01-01 00:00:00", 0.5,
                            {std::vector<float>(5, 0.0f)});
    const std::string generation =
        "Number_Of_Records = 1\nINTERNAL_GEN_DATA_1 {\nFirst_Line_Pos = 2, 2\n"
        "Last_Line_Pos = 2, 4\nWave_Type = 0\n" +
        bwtest::DataFileSection("gen.xol0") + "}\n";
    const std::string deep = "Deep_Water_Terms = true\nDispersion_Factor = ";
    // The bathymetry of the 1DH model lies along one axis.
    bwtest::WriteLineFile(dir / "line.xol1", "2004-01-01 00:00:00", 1.0, 1.0f,
                          {{{1.0f, -2.0f, -2.0f, -2.0f, 1.0f}}});
    const struct {
        Sections sections;
        const char* message;
        std::vector<const char*> inLog = {};
        std::string bathymetry = "bed.xol2";
    } cases[] = {
        {{{"Sponge", "-"}}, "KVT section: Sponge not found"},
        {{{"Sponge", "Sponge_Type = true\n"}}, "KVT section: DATA_FILE not found"},
        {{{"SURFACE_ELEVATION", "-"}}, "KVT section: SURFACE_ELEVATION not found"},
        {{{"Equation_Parameters", deep + "0.167\n"}},
         "Dispersion factor out of valid range (-0.333 .. 0.166)"},
        {{{"SOLUTION_PARAMETERS", "Grid_scale_filter = 1.5\n"}},
         "Grid scale filter out of valid range (0 .. 1)"},
        {{{"Porosity", "Porosity_Type = true\n" + Map("por.xol2", 0.1f)}},
         "_SetupPorosity: porosity value outside interval 0.2<=n<=1: {dir}/por.xol2: 0.1 at point "
         "(1,1)"},
        {{{"Sponge", "Sponge_Type = true\n" + Map("sponge.xol2", 0.5f)}},
         "_SetupSpongeLayer: sponge coefficient outside interval 1<=s<=100: {dir}/sponge.xol2: 0.5 "
         "at point (1,1)"},
        {{{"EXPLICIT_FILTERING", "type = 2\n" + Map("filter.xol2", 1.5f)}},
         "_SetupExplicitFilter: filter coefficient outside interval 0<=f<=1: {dir}/filter.xol2: "
         "1.5 at point (1,1)"},
        {{{"EXPLICIT_FILTERING", "type = 3\n"}}, "_SetupExplicitFilter: Wrong type of filter"},
        {{{"Bottom_Friction", "Resistance_Type = 3\n"}},
         "Bottom Friction: Wrong type of bottom friction formulation"},
        {{{"EDDY_VISCOSITY", "Type = 3\nFormulation = 0\nBase = 1\n"}},
         "_EddyViscocity: Wrong type of format"},
        {{{"EDDY_VISCOSITY", "Type = 1\nFormulation = 2\nBase = 1\nConstant_Value = 1\n"}},
         "_EddyViscocity: Wrong type of eddy formulation"},
        {{{"BASIC_MODEL_PARAMETERS", "NUMBER_OF_DIMENSIONS = 3\n"}},
         "ReadModelSetup: NUMBER_OF_DIMENSIONS must be 1 or 2, not 3"},
        {{{"Internal_Generation", generation}, {"Equation_Parameters", deep + "0.0667\n"}},
         "SetupInternalGeneration: the deep water terms need two items in the series"},
        // The profile's bed levels given as the filter's map.
        {bwtest::ProfileSections(
             {{"EXPLICIT_FILTERING", "type = 2\n" + bwtest::DataFileSection("line.xol1")}}),
         "SetupFilter: filter coefficient outside interval 0<=f<=1: {dir}/line.xol1: -2 at point 1",
         {},
         "line.xol1"},
    };
    for (const auto& c : cases) {
        const bwtest::RunResult r = Run(c.sections, c.bathymetry);
        EXPECT_EQ(r.exitCode, 1) << c.message;
        // A map's range check names the map, found in the test's folder.
        std::string message = c.message;
        if (const size_t at = message.find("{dir}"); at != std::string::npos)
            message.replace(at, 5, dir.path.string());
        EXPECT_EQ(r.out, message + "\n");
        const std::string log = bwtest::ReadFile(dir / "m.log");
        EXPECT_NE(log.find("Abnormal completion"), std::string::npos) << c.message;
        for (const char* text : c.inLog) EXPECT_NE(log.find(text), std::string::npos) << text;
    }
}

// A bathymetry the engine can't use stops the run with the file and the
// reason: not a data file, on a third spatial axis, with a bed that holds a
// value that is no number (its place named), and for the 1DH model on two
// axes.
TEST_F(ModelFile, ABathymetryThatCanNotBeUsedStopsNamingTheFileAndTheReason) {
    bwtest::WriteFile(dir / "text.xol2", "TARNEL_BOUSSINESQ_WAVE {\n}\n");
    std::vector<float> bed = bwtest::Constant(grid, -2.0f);
    bed[4 * (grid.J + 1) + 3] = std::numeric_limits<float>::quiet_NaN();
    bwtest::WriteMapFile(dir / "nan.xol2", grid, bed);
    XolFile f = XolCreateHeader("Cube", 1, 3);
    XolSetItem(f, 1, 100079, "Bathymetry", 1000);
    for (int axis = 1; axis <= 3; ++axis) XolSetAxis(f, axis, 1.0f, 0.0f, 3);
    XolSetCalendarAxis(f, 1.0, "2004-01-01 00:00:00");
    XolSetProjection(f, "NON-UTM", 0.0, 0.0);
    XolCreateFile(f, dir / "cube.xol3");
    XolWriteDynamic(f, std::vector<float>(27, -1.0f).data());
    XolClose(f);
    const struct {
        std::string bathymetry, message;
        Sections sections = {};
    } cases[] = {
        {"text.xol2", "XOL file can not be opened: %: not a data file of this engine"},
        {"cube.xol3", "XOL data is not 2D: %: it has 3 spatial axes where a bathymetry has 2"},
        {"nan.xol2",
         "XOL data holds a value that is not a finite number: %, item 1 \"Bathymetry\", "
         "point (3,4)"},
        {"bed.xol2",
         "XOL data is not 1D: %: it has 2 spatial axes where a bathymetry of the 1DH model has 1",
         {{"BASIC_MODEL_PARAMETERS", "NUMBER_OF_DIMENSIONS = 1\n"}}},
    };
    for (const auto& c : cases) {
        const bwtest::RunResult r = Run(c.sections, c.bathymetry);
        EXPECT_EQ(r.exitCode, 1) << c.bathymetry;
        std::string message = c.message;
        message.replace(message.find('%'), 1, dir / c.bathymetry);
        EXPECT_EQ(r.out, message + "\n");
    }
}

}  // namespace
