// The mesh solver's file of a 1DH model: the engine reads a model file of
// one dimension and writes "<model file>_FEM.kvt" beside it, which the run
// then reads; -check ends normally once the file is written.
// The file is loaded back with the parameter library and its values are
// compared with what the model file says.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cmath>
#include <filesystem>

#include "meshsolver/output_info.hpp"
#include "platform/kvt/kvt.hpp"
#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace {

using Sections = std::map<std::string, std::string>;

constexpr int kJ = 20;       // points 0..20: nodes 1..21
constexpr float kDx = 2.5f;  // spacing of the line

// The parameter file loaded back; values looked up by a path of sections.
struct FemFile {
    KvtHandle file = 0, target = 0;
    explicit FemFile(const std::string& path) {
        kvtLoadFile(path.c_str(), 0, &file);
        target = kvtTargetByNameNum(file, "MeshSolverBW", 1);
    }
    ~FemFile() { kvtClose(&file); }
    // "A.B.C": sections below the target.
    KvtHandle Section(const std::string& path) const {
        KvtHandle node = target;
        size_t from = 0;
        while (node != 0 && from <= path.size()) {
            const size_t dot = path.find('.', from);
            const std::string name = path.substr(from, dot - from);
            node = kvtSectionByNameNum(node, name.c_str(), 1);
            if (dot == std::string::npos) break;
            from = dot + 1;
        }
        return node;
    }
    KvtHandle Param(const std::string& section, const char* key, int n = 1) const {
        return kvtParamByNum(kvtKeywordByNameNum(Section(section), key, 1), n);
    }
    bool Has(const std::string& section, const char* key) const {
        return kvtKeywordByNameNum(Section(section), key, 1) != 0;
    }
    int Int(const std::string& section, const char* key, int n = 1) const {
        const KvtHandle p = Param(section, key, n);
        EXPECT_TRUE(kvtIsInt(p)) << section << "." << key;
        return kvtGetInt(p);
    }
    std::vector<int> Ints(const std::string& section, const char* key) const {
        std::vector<int> v;
        const KvtHandle k = kvtKeywordByNameNum(Section(section), key, 1);
        for (int n = 1; n <= kvtParamCount(k); ++n) v.push_back(kvtGetInt(kvtParamByNum(k, n)));
        return v;
    }
    double Double(const std::string& section, const char* key) const {
        const KvtHandle p = Param(section, key);
        EXPECT_TRUE(kvtIsReal(p)) << section << "." << key;
        return kvtGetDouble(p);
    }
    // A 32-bit real, as the solver reads it.
    float Float(const std::string& section, const char* key) const {
        const KvtHandle p = Param(section, key);
        EXPECT_TRUE(kvtIsReal(p)) << section << "." << key;
        return kvtGetFloat(p);
    }
    std::string Text(const std::string& section, const char* key) const {
        const KvtHandle p = Param(section, key);
        EXPECT_TRUE(kvtIsString(p)) << section << "." << key;
        const char* s = kvtGetString(p);
        return s != nullptr ? s : "";
    }
};

std::string Record(int n, const std::string& body) {
    return "OUTPUT_SPEC_DATA_" + std::to_string(n) + " {\n" + body + "}\n";
}

std::string BoundaryRecord(int j, int formulation, const std::string& file, int items) {
    std::string numbers = "1";
    for (int i = 2; i <= items; ++i) numbers += ", " + std::to_string(i);
    return "Number_Of_Boundaries = 1\nBOUNDARY_DATA_1 {\nFirst_Point = " + std::to_string(j) +
           ", 0\nLast_Point = " + std::to_string(j) +
           ", 0\nFormulation = " + std::to_string(formulation) +
           "\nData_Specification = 0\nDATA_FILE {\nFile_name = file(\"" + file +
           "\")\nItem_Count = " + std::to_string(items) + "\nItem_Numbers = " + numbers +
           "\n}\n}\n";
}

class Translation : public testing::Test {
protected:
    bwtest::TempDir dir;
    std::string fem;  // the path of the written file

    void SetUp() override {
        fem = dir / "m.bw_FEM.kvt";
        std::vector<float> bed(kJ + 1);
        for (int j = 0; j <= kJ; ++j) bed[j] = -4.0f + 0.15f * static_cast<float>(j);
        bwtest::WriteLineFile(dir / "line.xol1", "2004-01-01 00:00:00", 1.0, kDx, {{bed}});
        // A line of its own positions: x, then the bed.
        std::vector<float> x(kJ + 1);
        for (int j = 0; j <= kJ; ++j) x[j] = 0.5f * static_cast<float>(j * j);
        bwtest::WriteLineFile(dir / "xz.xol1", "2004-01-01 00:00:00", 1.0, 1.0f, {{x}, {bed}});
    }

    // A 1DH model: the sections of the grid model that one dimension does not
    // read are left out, the outputs of one dimension are there.
    static Sections Model(Sections given) { return bwtest::ProfileSections(std::move(given)); }

    bwtest::RunResult Run(const Sections& given, bool check = true,
                          const std::string& bathymetry = "line.xol1") {
        std::filesystem::remove(fem);
        bwtest::WriteFile(dir / "m.bw", bwtest::ModelText(bathymetry, Model(given)));
        std::vector<std::string> argv = {bwtest::BuiltProgram("bw")};
        if (check) argv.push_back("-check");
        argv.push_back("m.bw");
        return bwtest::RunProgram(argv, dir.path.string(), {{"TARN_PROGRESS", "NONE"}},
                                  {"BUILDMODE", "TRF"});
    }
    // Runs the check and expects it to end normally with the file written.
    void Translate(const Sections& given, const std::string& bathymetry = "line.xol1") {
        const bwtest::RunResult r = Run(given, true, bathymetry);
        ASSERT_EQ(r.exitCode, 0) << r.out << r.err;
        ASSERT_TRUE(std::filesystem::exists(fem));
    }
};

// A run and a check both end normally, and the file stays whatever
// DELETE_FEM_KVT_FILE says; the log echoes that key and every setting of the
// 1DH sections.
TEST_F(Translation, TheFileIsWrittenAndStaysWhateverTheDeleteFlag) {
    for (const char* flag : {"0", "1"}) {
        const Sections s = {
            {"BASIC_MODEL_PARAMETERS",
             std::string("NUMBER_OF_DIMENSIONS = 1\nDELETE_FEM_KVT_FILE = ") + flag + "\n"}};
        bwtest::RunResult r = Run(s, false);
        EXPECT_EQ(r.exitCode, 0) << r.out;
        ASSERT_TRUE(std::filesystem::exists(fem)) << flag;
        FemFile f(fem);
        EXPECT_NE(f.Section("BOUSSINESQ_WAVE_MODULE.SOLUTION_TECHNIQUE.LINEAR_EQUATION_SYSTEM"), 0u)
            << "the file ends with the last section";
        const std::string log = bwtest::ReadFile(dir / "m.log");
        EXPECT_NE(log.find("DELETE_FEM_KVT_FILE : " + std::string(flag)), std::string::npos);
        EXPECT_NE(log.find("Mesh solver file: m.bw_FEM.kvt"), std::string::npos);
        EXPECT_NE(log.find("INCLUDE_CALCULATION"), std::string::npos);
        EXPECT_NE(log.find("supg_coefficient"), std::string::npos);
        EXPECT_NE(log.find("Successful completion"), std::string::npos);

        r = Run(s, true);
        EXPECT_EQ(r.exitCode, 0) << r.out;
        EXPECT_TRUE(std::filesystem::exists(fem));
        EXPECT_NE(bwtest::ReadFile(dir / "m.log").find("Successful completion"), std::string::npos);
    }
    // A key the 1DH reading does not know is still reported, before the
    // model file is closed.
    const bwtest::RunResult r =
        Run({{"OUTPUT_STATISTIC_1D", "Number_Of_Records = 0\nEps_Hihg = 0.1\n"}});
    EXPECT_EQ(r.exitCode, 0);
    EXPECT_NE(r.out.find("Eps_Hihg"), std::string::npos) << r.out;
}

// The order and nesting of the sections, and the settings the solver needs
// to start: run period, domain, equation, fixed numerics, options.
TEST_F(Translation, SectionsInTheirOrderWithTheRunPeriodAndFixedNumerics) {
    Translate({{"Simulation_Period",
                "Time_step_count = 250\nTime_step_interval = 0.04\nWarm_up_period = 30\n"
                "Start_time = 2010, 12, 31, 13, 7, 45\n"},
               {"Area_Description", "True_land_value = 0\nReference_Level_Shift = 0.3\n"},
               {"OPTION_PARAMETERS", "DAES_method = 2\nsupg_coefficient = 0.1\n"}});
    FemFile f(fem);
    std::vector<std::string> top, module;
    for (int n = 1; KvtHandle c = kvtChildByNum(f.target, n); ++n) top.push_back(kvtGetName(c));
    EXPECT_EQ(top, (std::vector<std::string>{"BASIC_MODEL_PARAMETERS", "TIME", "DOMAIN",
                                             "BOUSSINESQ_WAVE_MODULE"}));
    for (int n = 1; KvtHandle c = kvtChildByNum(f.Section("BOUSSINESQ_WAVE_MODULE"), n); ++n)
        module.push_back(kvtGetName(c));
    EXPECT_EQ(module,
              (std::vector<std::string>{
                  "EQUATION", "TIME", "SPACE", "DEPTH", "BED_RESISTANCE", "EDDY_VISCOSITY",
                  "SPONGE_LAYER", "SLOT", "POROSITY_LAYER", "WAVE_BREAKING", "EXPLICIT_FILTERING",
                  "STARTING_CONDITIONS", "BOUNDARY_CONDITIONS", "OUTPUT", "SOLUTION_TECHNIQUE"}));

    EXPECT_EQ(f.Int("BASIC_MODEL_PARAMETERS", "number_of_dimensions"), 1);
    EXPECT_EQ(f.Int("TIME", "number_of_time_steps"), 250);
    EXPECT_EQ(f.Double("TIME", "time_step_interval"), 0.04);
    EXPECT_EQ(f.Ints("TIME", "start_time"), (std::vector<int>{2010, 12, 31, 13, 7, 45}));
    EXPECT_EQ(f.Text("DOMAIN", "file_name"), dir / "line.xol1");
    EXPECT_EQ(f.Int("DOMAIN", "type_of_mesh"), 2);
    EXPECT_EQ(f.Int("BOUSSINESQ_WAVE_MODULE.SPACE", "number_of_mesh_velocity"), 2);
    EXPECT_EQ(f.Float("BOUSSINESQ_WAVE_MODULE.DEPTH", "minimum_value"), 0.03f);
    EXPECT_EQ(f.Float("BOUSSINESQ_WAVE_MODULE.DEPTH", "datum_level"), 0.3f);
    // 32-bit reals on disk as such; the tolerance a 32-bit real widened.
    const std::string text = bwtest::ReadFile(fem);
    EXPECT_NE(text.find("minimum_value = 0.0299999993\n"), std::string::npos);
    EXPECT_NE(text.find("absolute_tolerance = 9.9999999747524271e-07\n"), std::string::npos);
    EXPECT_EQ(f.Double("BOUSSINESQ_WAVE_MODULE.BOUNDARY_CONDITIONS.CODE_4", "soft_time_interval"),
              30 * 0.04);

    const std::string solution = "BOUSSINESQ_WAVE_MODULE.SOLUTION_TECHNIQUE";
    const std::string daes = solution + ".DIFFERENTIAL_ALGEBRAIC_EQUATION_SYSTEM";
    EXPECT_EQ(f.Int(solution, "type_of_supg"), -1);
    EXPECT_EQ(f.Double(solution, "supg_coefficient"), 0.1);
    EXPECT_EQ(f.Int(daes, "method"), 2);
    EXPECT_EQ(f.Double(daes, "absolute_tolerance"), static_cast<double>(1.0e-6f));
    EXPECT_EQ(f.Double(daes, "relative_tolerance"), static_cast<double>(1.0e-6f));
    EXPECT_EQ(f.Int(solution + ".LINEAR_EQUATION_SYSTEM", "method"), 1);

    // The defaults of the options stand when the file leaves them out.
    Translate({});
    FemFile d(fem);
    EXPECT_EQ(d.Int(daes, "method"), 1);
    EXPECT_EQ(d.Double(solution, "supg_coefficient"), 0.05);
}

// Where the waves come in: the node codes of DOMAIN and the three codes of
// BOUNDARY_CONDITIONS, from the first boundary and the first generation record.
TEST_F(Translation, NodeCodesAndBoundaryConditionsFollowTheBoundaryAndGenerationRecords) {
    const std::string gen =
        "Number_Of_Records = 1\n" + bwtest::GenerationRecord(1, 6, 0, 6, 0, 0, "gen.xol0");
    const struct {
        const char* what;
        Sections sections;
        std::vector<int> nodes, codes;
        int type2, format2, type3, format3;
        std::string file3;
        std::vector<int> items3;
    } cases[] = {
        {"none", {}, {1, kJ + 1}, {2, 2}, 4, 0, 4, 0, "", {}},
        {"level on the left",
         {{"Boundary_Location", BoundaryRecord(0, 0, "left.xol0", 1)}},
         {1, kJ + 1},
         {2, 2},
         3,
         1,
         3,
         0,
         "",
         {}},
        {"flux on the right",
         {{"Boundary_Location", BoundaryRecord(kJ, 1, "right.xol0", 2)}},
         {kJ, kJ + 1},
         {2, 3},
         4,
         0,
         4,
         1,
         "right.xol0",
         {1, 2}},
        {"level on the right",
         {{"Boundary_Location", BoundaryRecord(kJ, 0, "right.xol0", 1)}},
         {kJ, kJ + 1},
         {2, 3},
         4,
         0,
         3,
         1,
         "right.xol0",
         {1}},
        {"unknown formulation on the left keeps the type",
         {{"Boundary_Location", BoundaryRecord(0, 2, "left.xol0", 1)}},
         {1, kJ + 1},
         {2, 2},
         4,
         1,
         4,
         0,
         "",
         {}},
        {"generation and a boundary on the right",
         {{"Internal_Generation", gen},
          {"Boundary_Location", BoundaryRecord(kJ, 0, "right.xol0", 1)}},
         {6, kJ + 1},
         {3, 4},
         4,
         0,
         6,
         1,
         "gen.xol0",
         {1, 2}},
    };
    const std::string bc = "BOUSSINESQ_WAVE_MODULE.BOUNDARY_CONDITIONS.";
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        Translate(c.sections);
        FemFile f(fem);
        EXPECT_EQ(f.Int("DOMAIN", "number_of_nodes"), 2);
        EXPECT_EQ(f.Ints("DOMAIN", "node_number_of_code"), c.nodes);
        EXPECT_EQ(f.Ints("DOMAIN", "value_of_code"), c.codes);
        EXPECT_EQ(f.Int(bc + "CODE_2", "type"), c.type2);
        EXPECT_EQ(f.Int(bc + "CODE_2", "format"), c.format2);
        EXPECT_EQ(f.Has(bc + "CODE_2", "file_name"), c.format2 == 1);
        if (c.format2 == 1) {
            EXPECT_EQ(f.Text(bc + "CODE_2", "file_name"), dir / "left.xol0");
        }
        EXPECT_EQ(f.Int(bc + "CODE_3", "type"), c.type3);
        EXPECT_EQ(f.Int(bc + "CODE_3", "format"), c.format3);
        EXPECT_EQ(f.Has(bc + "CODE_3", "file_name"), c.format3 == 1);
        if (c.format3 == 1) {
            EXPECT_EQ(f.Text(bc + "CODE_3", "file_name"), dir / c.file3);
            EXPECT_EQ(f.Ints(bc + "CODE_3", "item_numbers"), c.items3);
        }
        EXPECT_EQ(f.Int(bc + "CODE_4", "type"), 4);
        EXPECT_EQ(f.Int(bc + "CODE_4", "format"), 0);
    }
}

// The equation and the processes in the solver's vocabulary.
TEST_F(Translation, EquationAndProcessesAreRecast) {
    const std::string module = "BOUSSINESQ_WAVE_MODULE.";
    Translate({{"Equation_Parameters", "Deep_Water_Terms = true\nDispersion_Factor = 0.1\n"},
               {"Bottom_Friction", "Resistance_Type = 1\nFormulation = 0\nConstant_Value = 40\n"},
               {"EDDY_VISCOSITY",
                "Type = 2\nFormulation = 0\nBase = 1\n" + bwtest::DataFileSection("eddy.xol1")},
               {"WAVE_BREAKING", "type = 1\ninitial_breaking_angle = 25\n"},
               {"MOVING_SHORELINE", "type = 1\nslot_depth = -7\n"}});
    {
        FemFile f(fem);
        EXPECT_EQ(f.Int(module + "EQUATION", "formulation"), 2);
        EXPECT_EQ(f.Float(module + "EQUATION", "beta"), 0.1f);
        EXPECT_EQ(f.Int(module + "BED_RESISTANCE", "type"), 3);  // Manning
        EXPECT_EQ(f.Int(module + "BED_RESISTANCE", "format"), 0);
        EXPECT_EQ(f.Float(module + "BED_RESISTANCE", "constant_value"), 40.0f);
        // Eddy viscosity is off in the mesh solver, whatever the model says.
        EXPECT_EQ(f.Int(module + "EDDY_VISCOSITY", "type"), 0);
        EXPECT_EQ(f.Int(module + "EDDY_VISCOSITY", "format"), 2);
        EXPECT_EQ(f.Text(module + "EDDY_VISCOSITY", "file_name"), dir / "eddy.xol1");
        EXPECT_EQ(f.Int(module + "WAVE_BREAKING", "type"), 1);
        // The angle stays in degrees.
        EXPECT_EQ(f.Double(module + "WAVE_BREAKING", "initial_breaking_angle"), 25.0);
        EXPECT_EQ(f.Int(module + "SLOT", "type"), 1);
        EXPECT_EQ(f.Int(module + "STARTING_CONDITIONS", "type"), 0);
    }
    // Without the deep water terms the model's factor is 0, whatever the
    // file says; a map of Chezy numbers.
    Translate({{"Equation_Parameters", "Deep_Water_Terms = false\nDispersion_Factor = 5\n"},
               {"Bottom_Friction",
                "Resistance_Type = 2\nFormulation = 1\n" + bwtest::DataFileSection("c.xol1", 3)},
               {"Sponge", "Sponge_Type = true\n" + bwtest::DataFileSection("sponge.xol1")},
               {"OPTION_PARAMETERS", "Sponge_Reference_p = 0.5\nSponge_Reference_s = 0.25\n"}});
    FemFile f(fem);
    EXPECT_EQ(f.Int(module + "EQUATION", "formulation"), 1);
    EXPECT_EQ(f.Float(module + "EQUATION", "beta"), 0.0f);
    EXPECT_EQ(f.Int(module + "BED_RESISTANCE", "type"), 2);  // Chezy
    EXPECT_EQ(f.Int(module + "BED_RESISTANCE", "format"), 2);
    EXPECT_EQ(f.Int(module + "BED_RESISTANCE", "item_number"), 3);
    EXPECT_EQ(f.Int(module + "SPONGE_LAYER", "type"), 1);
    EXPECT_EQ(f.Float(module + "SPONGE_LAYER", "reference_velocity"), 0.5f);
    EXPECT_EQ(f.Float(module + "SPONGE_LAYER", "reference_elevation"), 0.25f);
    EXPECT_EQ(f.Int(module + "SLOT", "type"), 0);
}

// The output files: lines as areas with origin, spacing and count; point
// series as points; statistics with the keys of their section; the moving
// shoreline with neither.
TEST_F(Translation, OutputFilesWithTheirPlacesAndTheStatistics) {
    const Sections outputs = {
        {"OUTPUT_DETERMINISTIC_1D",
         "Number_Of_Records = 3\n" +
             Record(1,
                    "File_Name = file(\"det.xol1\")\nX_Range_And_Interval = 2, 12\n"
                    "No_of_points = 6\nFirst_Time_step = 5\nLast_Time_step = 50\n"
                    "Time_Step_Interval = 5\nNumber_Of_Items = 3\nTitle = \"Line\"\n") +
             Record(2,
                    "File_Name = file(\"gauges.xol0\")\nNO_OF_POINTS = 3\n"
                    "X_Range_And_Interval = 0, 5, 20\nNumber_Of_Items = 2\n"
                    "Item_Numbers = 1, 4\n") +
             Record(3,
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
             Record(1, "File_Name = file(\"shore.xol0\")\nNumber_Of_Items = 2\n")},
    };
    Translate(outputs);
    FemFile f(fem);
    const std::string out = "BOUSSINESQ_WAVE_MODULE.OUTPUT";
    EXPECT_EQ(f.Int(out, "number_of_output_files"), 5);
    const std::string ws = out + ".WAVE_STATISTIC";
    EXPECT_EQ(f.Int(ws, "Type_of_wave_statistic"), 2);
    EXPECT_EQ(f.Int(ws, "Type_of_mean_calculation"), 1);
    EXPECT_EQ(f.Int(ws, "first_time_step"), 100);
    EXPECT_EQ(f.Int(ws, "Last_time_step"), 200);
    EXPECT_EQ(f.Int(ws, "time_step_frequency"), 2);
    EXPECT_EQ(f.Int(ws, "Number_of_first_waves"), 3);
    EXPECT_EQ(f.Float(ws, "High_elevation_limit"), 0.01f);
    EXPECT_EQ(f.Float(ws, "Low_elevation_limit"), -1.0e-4f);

    const std::string line = out + ".OUTPUT_FILE_1";
    EXPECT_EQ(f.Int(line, "type"), 1);
    EXPECT_EQ(f.Int(line, "format"), 1);
    EXPECT_EQ(f.Text(line, "title"), "Line");
    EXPECT_EQ(f.Ints(line, "type_of_variables"), (std::vector<int>{1, 2, 3}));
    EXPECT_EQ(f.Int(line, "first_time_step"), 5);
    EXPECT_EQ(f.Int(line, "time_step_frequency"), 5);
    EXPECT_EQ(f.Float(line + ".AREA", "x_origo"), 2.0f * kDx);
    EXPECT_EQ(f.Float(line + ".AREA", "x_ds"), kDx * 2.0f);
    EXPECT_EQ(f.Int(line + ".AREA", "x_npoints"), 6);
    EXPECT_FALSE(f.Has(line, "number_of_points"));

    const std::string gauges = out + ".OUTPUT_FILE_2";
    EXPECT_EQ(f.Int(gauges, "format"), 0);
    EXPECT_EQ(f.Ints(gauges, "type_of_variables"), (std::vector<int>{1, 4}));
    EXPECT_EQ(f.Int(gauges, "number_of_points"), 3);
    EXPECT_EQ(f.Float(gauges + ".POINT_2", "x"), 5.0f * kDx);
    EXPECT_EQ(f.Float(gauges + ".POINT_3", "x"), 20.0f * kDx);
    EXPECT_EQ(f.Section(gauges + ".AREA"), 0u);

    EXPECT_EQ(f.Float(out + ".OUTPUT_FILE_3.AREA", "x_ds"), 1.0f);  // one point

    const std::string stat = out + ".OUTPUT_FILE_4";
    EXPECT_EQ(f.Int(stat, "type"), 2);
    EXPECT_EQ(f.Int(stat, "format"), 1);
    EXPECT_EQ(f.Int(stat, "first_time_step"), 100);  // from its section
    EXPECT_EQ(f.Float(stat + ".AREA", "x_ds"), kDx);

    const std::string shore = out + ".OUTPUT_FILE_5";
    EXPECT_EQ(f.Int(shore, "type"), 3);
    EXPECT_EQ(f.Int(shore, "format"), 0);
    EXPECT_EQ(f.Text(shore, "file_name"), dir / "shore.xol0");
    EXPECT_FALSE(f.Has(shore, "number_of_points"));
    EXPECT_EQ(f.Section(shore + ".AREA"), 0u);
}

// A bathymetry of its own positions (x, then the bed): points sit at the
// positions of the table; a line's range is taken as it stands.
TEST_F(Translation, OnALineOfItsOwnPositionsPointsComeFromTheTable) {
    Translate(
        {{"Bathymetry_Selection", "Hot_Start = false\n" + bwtest::DataFileSection("xz.xol1", 2)},
         {"OUTPUT_DETERMINISTIC_1D",
          "Number_Of_Records = 2\n" +
              Record(1,
                     "File_Name = file(\"p.xol0\")\nNO_OF_POINTS = 2\n"
                     "X_Range_And_Interval = 3, 10\n") +
              Record(2,
                     "File_Name = file(\"l.xol1\")\nX_Range_And_Interval = 4, 14\n"
                     "No_of_points = 3\n")}},
        "xz.xol1");
    FemFile f(fem);
    const std::string out = "BOUSSINESQ_WAVE_MODULE.OUTPUT";
    EXPECT_EQ(f.Float(out + ".OUTPUT_FILE_1.POINT_1", "x"), 4.5f);
    EXPECT_EQ(f.Float(out + ".OUTPUT_FILE_1.POINT_2", "x"), 50.0f);
    EXPECT_EQ(f.Float(out + ".OUTPUT_FILE_2.AREA", "x_origo"), 4.0f);
    EXPECT_EQ(f.Float(out + ".OUTPUT_FILE_2.AREA", "x_ds"), 5.0f);
}

// The messages of the 1DH output sections that a model file can reach.
TEST_F(Translation, BadOutputRecordsStopTheRunWithTheirMessage) {
    const struct {
        Sections sections;
        std::string message;
    } cases[] = {
        {{{"OUTPUT_DETERMINISTIC_1D",
           "Number_Of_Records = 1\n" + Record(1, "File_Name = file(\"out.txt\")\n")}},
         "SetupOutputInfo1D: Wrong file extension"},
        {{{"OUTPUT_MOVING_SHORELINE_1D",
           "INCLUDE_CALCULATION = true\n" + Record(1, "File_Name = file(\"shore.xol3\")\n")}},
         "SetupOutputInfo1D: Wrong file extension"},
        {{{"OUTPUT_DETERMINISTIC_1D",
           "Number_Of_Records = 1\n" + Record(1,
                                              "File_Name = file(\"g.xol0\")\nNO_OF_POINTS = 2\n"
                                              "X_Range_And_Interval = 3, 21\n")}},
         "SetupOutputInfo1D: a point of X_Range_And_Interval of record 1 is 21 and lies outside "
         "the grid (0..20)"},
        {{{"OUTPUT_DETERMINISTIC_1D",
           "Number_Of_Records = 1\n" + Record(1,
                                              "File_Name = file(\"g.xol0\")\nNO_OF_POINTS = 3\n"
                                              "X_Range_And_Interval = 3, 4\n")}},
         "SetupOutputInfo1D: X_Range_And_Interval of record 1 holds 2 values where 3 are needed"},
        {{{"OUTPUT_STATISTIC_1D", "-"}}, "KVT section: OUTPUT_STATISTIC_1D not found"},
        {{{"OUTPUT_DETERMINISTIC_1D",
           "Number_Of_Records = 2\n" + Record(1, "File_Name = file(\"a.xol0\")\n")}},
         "KVT section: OUTPUT_SPEC_DATA_2 not found"},
    };
    for (const auto& c : cases) {
        const bwtest::RunResult r = Run(c.sections, true);
        EXPECT_EQ(r.exitCode, 1) << c.message;
        EXPECT_NE(r.out.find(c.message), std::string::npos) << r.out;
        EXPECT_FALSE(std::filesystem::exists(fem)) << c.message;
    }
}

// A list other than the three cannot come from a model file; the reader
// refuses it all the same.
TEST(OutputInfo1D, AListOtherThanTheThreeStops) {
    // The message goes to the screen: stdout, here into the death test's stderr.
    EXPECT_EXIT(
        {
            dup2(2, 1);
            ReadOutputInfo1DH(0, 4, 1);
        },
        testing::ExitedWithCode(1), "OutputInfo_1DH: Wrong type of output");
}

}  // namespace
