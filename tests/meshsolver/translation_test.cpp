// The mesh solver's file of a 1DH model: the engine reads a model file of
// one dimension and writes "<model file>_FEM.kvt" beside it, which the run
// then reads; -check ends normally once the file is written.
// The file is loaded back with the parameter library and its values, as the
// file writes them, are compared with what the model file says.
#include <gtest/gtest.h>

#include <filesystem>
#include <sstream>

#include "equations_flume.hpp"

namespace {

using bwtest::BoundaryRecord;
using bwtest::Record;
using bwtest::Sections;
using Values = std::vector<std::pair<std::string, std::string>>;

// The parameter file loaded back.
struct FemFile {
    KvtHandle file = 0, target = 0;
    explicit FemFile(const std::string& path) {
        kvtLoadFile(path.c_str(), 0, &file);
        target = kvtTargetByNameNum(file, "MeshSolverBW", 1);
    }
    ~FemFile() { kvtClose(&file); }
    // "A.B": sections below the target.
    KvtHandle Section(const std::string& path) const {
        KvtHandle node = target;
        for (size_t from = 0; node != 0 && from < path.size();) {
            const size_t dot = std::min(path.find('.', from), path.size());
            node = kvtSectionByNameNum(node, path.substr(from, dot - from).c_str(), 1);
            from = dot + 1;
        }
        return node;
    }
    std::vector<std::string> Children(const std::string& path) const {
        std::vector<std::string> names;
        for (int n = 1; KvtHandle c = kvtChildByNum(Section(path), n); ++n)
            names.push_back(kvtGetName(c));
        return names;
    }
    // "A.B.key" (".B.key" below the Boussinesq module): the parameters of
    // the keyword in the file's syntax, comma separated; "" when it is not there.
    std::string Value(std::string path) const {
        if (path.starts_with(".")) path = "BOUSSINESQ_WAVE_MODULE" + path;
        const size_t dot = path.rfind('.');
        const KvtHandle section = dot == std::string::npos ? target : Section(path.substr(0, dot));
        const KvtHandle key = kvtKeywordByNameNum(section, path.substr(dot + 1).c_str(), 1);
        std::string text;
        for (int n = 1; key != 0 && n <= kvtParamCount(key); ++n)
            text += (n > 1 ? ", " : "") + std::string(kvtGetParamText(kvtParamByNum(key, n)));
        return text;
    }
    // Each entry names a section and keys ("A.B.k1 k2") and gives their
    // values joined by " | ".
    void Expect(const Values& values) const {
        for (const auto& [path, value] : values) {
            const size_t dot = path.rfind('.') + 1;
            std::istringstream keys(path.substr(dot));
            std::string found, key;
            while (keys >> key)
                found += (found.empty() ? "" : " | ") + Value(path.substr(0, dot) + key);
            EXPECT_EQ(found, value) << path;
        }
    }
};

// The flume on a slope from -4 m to -1 m, and a line of its own positions.
class Translation : public bwtest::ProfileModel {
protected:
    std::string fem = dir / "m.bw_FEM.kvt";  // the path of the written file

    void SetUp() override {
        std::vector<float> bed(kJ + 1), x(kJ + 1);
        for (int j = 0; j <= kJ; ++j) {
            bed[j] = -4.0f + 0.15f * static_cast<float>(j);
            x[j] = 0.5f * static_cast<float>(j * j);
        }
        Bed(bed);
        bwtest::WriteLineFile(dir / "xz.xol1", "2004-01-01 00:00:00", 1.0, 1.0f, {{x}, {bed}});
    }
    // Runs the check and expects the model reader to write the file. The
    // check goes on into the mesh solver's setup, which may refuse what a
    // case here leaves out (the maps it names are not written).
    void Translate(const Sections& given, const std::string& bathymetry = "line.xol1") {
        std::filesystem::remove(fem);
        const bwtest::RunResult r = bwtest::RunProfileModel(dir, given, true, bathymetry);
        ASSERT_TRUE(std::filesystem::exists(fem)) << r.out << r.err;
    }
};

// A run ends normally and the file, its sections in their order and
// nesting, stays whatever DELETE_FEM_KVT_FILE says; the log echoes that key
// and the settings of the 1DH sections. A key the 1DH reading does not know
// is still reported.
TEST_F(Translation, TheFileIsWrittenAndStaysWhateverTheDeleteFlag) {
    for (const std::string flag : {"0", "1"}) {
        std::filesystem::remove(fem);
        const bwtest::RunResult r =
            Run({{"BASIC_MODEL_PARAMETERS",
                  "NUMBER_OF_DIMENSIONS = 1\nDELETE_FEM_KVT_FILE = " + flag + "\n"}},
                false);
        EXPECT_EQ(r.exitCode, 0) << r.out;
        ASSERT_TRUE(std::filesystem::exists(fem)) << flag;
        const FemFile f(fem);
        EXPECT_EQ(f.Children(""), (std::vector<std::string>{"BASIC_MODEL_PARAMETERS", "TIME",
                                                            "DOMAIN", "BOUSSINESQ_WAVE_MODULE"}));
        EXPECT_EQ(
            f.Children("BOUSSINESQ_WAVE_MODULE"),
            (std::vector<std::string>{"EQUATION", "TIME", "SPACE", "DEPTH", "BED_RESISTANCE",
                                      "EDDY_VISCOSITY", "SPONGE_LAYER", "SLOT", "POROSITY_LAYER",
                                      "WAVE_BREAKING", "EXPLICIT_FILTERING", "STARTING_CONDITIONS",
                                      "BOUNDARY_CONDITIONS", "OUTPUT", "SOLUTION_TECHNIQUE"}));
        EXPECT_NE(f.Section("BOUSSINESQ_WAVE_MODULE.SOLUTION_TECHNIQUE.LINEAR_EQUATION_SYSTEM"),
                  0u);
        const std::string log = bwtest::ReadFile(dir / "m.log");
        for (const std::string& line :
             {"DELETE_FEM_KVT_FILE : " + flag, std::string("Mesh solver file: m.bw_FEM.kvt"),
              std::string("INCLUDE_CALCULATION"), std::string("supg_coefficient"),
              std::string("Successful completion")})
            EXPECT_NE(log.find(line), std::string::npos) << line;
    }
    const bwtest::RunResult r =
        Run({{"OUTPUT_STATISTIC_1D", "Number_Of_Records = 0\nEps_Hihg = 0.1\n"}}, true);
    EXPECT_EQ(r.exitCode, 0);
    EXPECT_NE(r.out.find("Eps_Hihg"), std::string::npos) << r.out;
}

// Where the waves come in, from the first boundary and the first generation
// record: the nodes and codes of DOMAIN, then type, format, file and items
// of the codes 2, 3 and 4 of BOUNDARY_CONDITIONS.
TEST_F(Translation, NodeCodesAndBoundaryConditionsFollowTheBoundaryAndGenerationRecords) {
    const std::string walls = "4 0 | 4 0 | 4 0";
    const struct {
        const char* what;
        std::string boundary, generation, expected;
    } cases[] = {
        {"none", "", "", "1, 21 | 2, 2 | " + walls},
        {"level on the left", BoundaryRecord(0, 0, "left.xol0", 1), "",
         "1, 21 | 2, 2 | 3 1 left.xol0 1 | 3 0 | 4 0"},
        {"flux on the right", BoundaryRecord(kJ, 1, "right.xol0", 2), "",
         "20, 21 | 2, 3 | 4 0 | 4 1 right.xol0 1, 2 | 4 0"},
        {"level on the right", BoundaryRecord(kJ, 0, "right.xol0", 1), "",
         "20, 21 | 2, 3 | 4 0 | 3 1 right.xol0 1 | 4 0"},
        {"unknown formulation on the left keeps the type", BoundaryRecord(0, 2, "left.xol0", 1), "",
         "1, 21 | 2, 2 | 4 1 left.xol0 1 | 4 0 | 4 0"},
        {"generation and a boundary on the right", BoundaryRecord(kJ, 0, "right.xol0", 1),
         bwtest::GenerationRecord(1, 6, 0, 6, 0, 0, "gen.xol0"),
         "6, 21 | 3, 4 | 4 0 | 6 1 gen.xol0 1, 2 | 4 0"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        Sections given;
        if (!c.boundary.empty()) given["Boundary_Location"] = c.boundary;
        if (!c.generation.empty())
            given["Internal_Generation"] = "Number_Of_Records = 1\n" + c.generation;
        Translate(given);
        const FemFile f(fem);
        std::string found =
            f.Value("DOMAIN.node_number_of_code") + " | " + f.Value("DOMAIN.value_of_code");
        for (const char* code : {"CODE_2.", "CODE_3.", "CODE_4."}) {
            found += " |";
            for (const char* key : {"type", "format", "file_name", "item_numbers"}) {
                const std::string v = f.Value(std::string(".BOUNDARY_CONDITIONS.") + code + key);
                if (!v.empty()) found += " " + v;
            }
        }
        // File names relative to the folder, unquoted.
        for (size_t at; (at = found.find("\"" + dir.path.string() + "/")) != std::string::npos;)
            found.erase(at, dir.path.string().size() + 2).erase(found.find('"', at), 1);
        EXPECT_EQ(found, c.expected);
        EXPECT_EQ(f.Value("DOMAIN.number_of_nodes"), "2");
    }
}

// The settings of the model in the solver's vocabulary: run period, domain,
// options, the equation (without the deep water terms the factor is 0,
// whatever the file says) and the processes (Manning or Chezy, constant or a
// map; eddy viscosity is off in the mesh solver whatever the model says; the
// breaking angle stays in degrees); the output files (a line as an area with
// origin, spacing and count, a spacing of 1 for one point, the items 1..n
// when none are named; the keys of the statistics from their section; the
// moving shoreline last). On a line of its own positions points sit at the
// positions of the table and a line's range is taken as it stands. Reals
// the solver reads as 32-bit values are written as such.
TEST_F(Translation, ModelSettingsInTheSolversVocabulary) {
    const std::string det = "Number_Of_Records = 2\n";
    const struct {
        const char* what;
        Sections sections;
        Values values;
        std::string bathymetry = "line.xol1";
    } cases[] = {
        {"period, options, equation and processes",
         {{"Simulation_Period",
           "Time_step_count = 250\nTime_step_interval = 0.04\nWarm_up_period = 30\n"
           "Start_time = 2010, 12, 31, 13, 7, 45\n"},
          {"Area_Description", "True_land_value = 0\nReference_Level_Shift = 0.3\n"},
          {"OPTION_PARAMETERS", "DAES_method = 2\nsupg_coefficient = 0.1\n"},
          {"Equation_Parameters", "Deep_Water_Terms = true\nDispersion_Factor = 0.1\n"},
          {"Bottom_Friction", "Resistance_Type = 1\nFormulation = 0\nConstant_Value = 40\n"},
          {"EDDY_VISCOSITY",
           "Type = 2\nFormulation = 0\nBase = 1\n" + bwtest::DataFileSection("eddy.xol1")},
          {"WAVE_BREAKING", "type = 1\ninitial_breaking_angle = 25\n"},
          {"MOVING_SHORELINE", "type = 1\nslot_depth = -7\n"}},
         {{"BASIC_MODEL_PARAMETERS.number_of_dimensions", "1"},
          {"TIME.number_of_time_steps time_step_interval start_time",
           "250 | 0.04 | 2010, 12, 31, 13, 7, 45"},
          {"DOMAIN.file_name", "\"" + (dir / "line.xol1") + "\""},
          {".DEPTH.minimum_value datum_level", "0.0299999993 | 0.300000012"},
          {".BOUNDARY_CONDITIONS.CODE_4.soft_time_interval", "1.2"},
          {".SOLUTION_TECHNIQUE.supg_coefficient", "0.1"},
          {".SOLUTION_TECHNIQUE.DIFFERENTIAL_ALGEBRAIC_EQUATION_SYSTEM.method", "2"},
          {".EQUATION.formulation beta", "2 | 0.100000001"},
          {".BED_RESISTANCE.type format constant_value", "3 | 0 | 40.0"},
          {".EDDY_VISCOSITY.type format file_name", "0 | 2 | \"" + (dir / "eddy.xol1") + "\""},
          {".WAVE_BREAKING.type initial_breaking_angle", "1 | 25.0"},
          {".SLOT.type", "1"},
          {".STARTING_CONDITIONS.type", "0"}}},
        {"classical equations, a map of Chezy numbers and a sponge",
         {{"Equation_Parameters", "Deep_Water_Terms = false\nDispersion_Factor = 5\n"},
          {"Bottom_Friction",
           "Resistance_Type = 2\nFormulation = 1\n" + bwtest::DataFileSection("c.xol1", 3)},
          {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol1")},
          {"OPTION_PARAMETERS", "Sponge_Reference_p = 0.5\nSponge_Reference_s = 0.25\n"}},
         {{".EQUATION.formulation beta", "1 | 0.0"},
          {".BED_RESISTANCE.type format item_number", "2 | 2 | 3"},
          {".SPONGE_LAYER.type reference_velocity reference_elevation", "1 | 0.5 | 0.25"},
          {".SLOT.type", "0"}}},
        {"output files",
         {{"OUTPUT_DETERMINISTIC_1D",
           det +
               Record(1,
                      "File_Name = file(\"det.xol1\")\nX_Range_And_Interval = 2, 12\n"
                      "No_of_points = 6\nNumber_Of_Items = 3\n") +
               Record(2,
                      "File_Name = file(\"one.dt1\")\nX_Range_And_Interval = 7, 7\n"
                      "No_of_points = 1\n")},
          {"OUTPUT_STATISTIC_1D",
           "Number_Of_Records = 1\nType = 2\nFirst_Time_Step = 100\nLast_Time_Step = 200\n"
           "Time_Step_Interval = 2\nNumber_Of_First_Wave = 3\nEps_High = 0.01\n" +
               Record(1,
                      "File_Name = file(\"stat.xol1\")\nX_Range_And_Interval = 0, 20\n"
                      "No_of_points = 21\n")},
          {"OUTPUT_MOVING_SHORELINE_1D",
           "INCLUDE_CALCULATION = true\n" +
               Record(1, "File_Name = file(\"shore.xol0\")\nNumber_Of_Items = 2\n")}},
         {{".OUTPUT.number_of_output_files", "4"},
          {".OUTPUT.WAVE_STATISTIC.Number_of_first_waves High_elevation_limit",
           "3 | 0.00999999978"},
          {".OUTPUT.OUTPUT_FILE_1.type_of_variables", "1, 2, 3"},
          {".OUTPUT.OUTPUT_FILE_1.AREA.x_origo x_ds x_npoints", "5.0 | 5.0 | 6"},
          {".OUTPUT.OUTPUT_FILE_2.AREA.x_ds", "1.0"},
          {".OUTPUT.OUTPUT_FILE_3.type first_time_step", "2 | 100"},
          {".OUTPUT.OUTPUT_FILE_4.type", "3"}}},
        {"outputs on a line of its own positions",
         {{"Bathymetry_Selection", "Hot_Start = false\n" + bwtest::DataFileSection("xz.xol1", 2)},
          {"OUTPUT_DETERMINISTIC_1D",
           det +
               Record(1,
                      "File_Name = file(\"p.xol0\")\nNO_OF_POINTS = 2\n"
                      "X_Range_And_Interval = 3, 10\n") +
               Record(2,
                      "File_Name = file(\"l.xol1\")\nX_Range_And_Interval = 4, 14\n"
                      "No_of_points = 3\n")}},
         {{".OUTPUT.OUTPUT_FILE_1.POINT_1.x", "4.5"},
          {".OUTPUT.OUTPUT_FILE_1.POINT_2.x", "50.0"},
          {".OUTPUT.OUTPUT_FILE_2.AREA.x_origo x_ds", "4.0 | 5.0"}},
         "xz.xol1"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        Translate(c.sections, c.bathymetry);
        FemFile(fem).Expect(c.values);
    }
}

}  // namespace
