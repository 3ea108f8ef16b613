#include "support/model_builder.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <numbers>
#include <sstream>

#include "data/xolfile.hpp"

namespace bwtest {

void WriteMapFile(const std::string& path, const MapSpec& grid, const std::vector<float>& values) {
    XolFile f = XolCreateHeader("Test map", 1, 2);
    XolSetItem(f, 1, 100079, grid.itemName, 1000);
    XolSetAxis(f, 1, grid.dx, 0.0f, grid.J + 1);
    XolSetAxis(f, 2, grid.dy, 0.0f, grid.K + 1);
    XolSetCalendarAxis(f, 1.0, "2000-01-01 00:00:00");
    XolSetDataType(f, grid.dataType);
    XolSetProjection(f, grid.projection, grid.longitude, grid.latitude, grid.orientation);
    XolCreateFile(f, path);
    XolWriteDynamic(f, values.data());
    XolClose(f);
}

std::vector<float> Constant(const MapSpec& grid, float value) {
    return std::vector<float>(static_cast<size_t>(grid.J + 1) * (grid.K + 1), value);
}

namespace {

// A header of levels named as given, the rest "Item n".
XolFile LevelsHeader(const std::string& title, size_t count, int dimension,
                     const std::vector<std::string>& names) {
    XolFile f = XolCreateHeader(title, static_cast<int>(count), dimension);
    for (size_t i = 0; i < count; ++i)
        XolSetItem(f, static_cast<int>(i + 1), 100078,
                   i < names.size() ? names[i] : "Item " + std::to_string(i + 1), 1000);
    return f;
}

}  // namespace

void WriteSeriesFile(const std::string& path, const std::string& start, double step,
                     const std::vector<std::vector<float>>& items,
                     const std::vector<std::string>& names) {
    XolFile f = LevelsHeader("Test series", items.size(), 0, names);
    XolSetCalendarAxis(f, step, start);
    XolCreateFile(f, path);
    for (size_t n = 0; n < items[0].size(); ++n)
        for (const auto& item : items) XolWriteDynamic(f, &item[n]);
    XolClose(f);
}

void WriteLineFile(const std::string& path, const std::string& start, double step, float spacing,
                   const std::vector<std::vector<std::vector<float>>>& items, int dataType,
                   const std::vector<std::string>& names) {
    XolFile f = LevelsHeader("Test line", items.size(), 1, names);
    XolSetAxis(f, 1, spacing, 0.0f, static_cast<int32_t>(items[0][0].size()));
    XolSetCalendarAxis(f, step, start);
    XolSetDataType(f, dataType);
    XolCreateFile(f, path);
    for (size_t n = 0; n < items[0].size(); ++n)
        for (const auto& item : items) XolWriteDynamic(f, item[n].data());
    XolClose(f);
}

void WriteUniformLineFile(const std::string& path, const std::string& start, double step,
                          float spacing, int points, const std::vector<std::vector<float>>& items) {
    std::vector<std::vector<std::vector<float>>> lines(items.size());
    for (size_t i = 0; i < items.size(); ++i)
        for (float v : items[i]) lines[i].emplace_back(static_cast<size_t>(points), v);
    WriteLineFile(path, start, step, spacing, lines);
}

std::vector<float> RampedSine(double a, double T, double dt, size_t count, double rampPeriods) {
    std::vector<float> v(count);
    for (size_t n = 0; n < count; ++n) {
        const double t = n * dt;
        v[n] = static_cast<float>(a * std::min(t / (rampPeriods * T), 1.0) *
                                  std::sin(2.0 * std::numbers::pi * t / T));
    }
    return v;
}

std::map<std::string, std::string> ProfileSections(std::map<std::string, std::string> given) {
    std::map<std::string, std::string> s = {
        {"BASIC_MODEL_PARAMETERS", "NUMBER_OF_DIMENSIONS = 1\nDELETE_FEM_KVT_FILE = 0\n"},
        {"SURFACE_ELEVATION", "-"},
        {"Output_Deterministic_2D", "-"},
        {"Output_Statistic_2D", "-"},
        {"Output_Disturbance_2D", "-"},
        {"Output_Hotstart_2D", "-"},
        {"OUTPUT_DETERMINISTIC_1D", "Number_Of_Records = 0\n"},
        {"OUTPUT_STATISTIC_1D", "Number_Of_Records = 0\n"},
        {"OUTPUT_MOVING_SHORELINE_1D", "INCLUDE_CALCULATION = false\n"},
    };
    for (auto& [name, body] : given) s[name] = body;
    return s;
}

std::string GenerationRecord(int n, int j1, int k1, int j2, int k2, int waveType,
                             const std::string& file) {
    std::ostringstream s;
    s << "INTERNAL_GEN_DATA_" << n << " {\nFirst_Line_Pos = " << j1 << ", " << k1
      << "\nLast_Line_Pos = " << j2 << ", " << k2 << "\nWave_Type = " << waveType
      << "\nDATA_FILE {\nFile_name = file(\"" << file
      << "\")\nItem_Count = 2\nItem_Numbers = 1, 2\n}\n}\n";
    return s.str();
}

std::string DataFileSection(const std::string& file, int item) {
    return "DATA_FILE {\n    File_name = file(\"" + file + "\")\n    Item_Count = 1\n" +
           "    Item_Numbers = " + std::to_string(item) + "\n}\n";
}

std::string ModelText(const std::string& bathymetryFile,
                      const std::map<std::string, std::string>& sections) {
    const std::vector<std::pair<std::string, std::string>> defaults = {
        {"BASIC_MODEL_PARAMETERS", "NUMBER_OF_DIMENSIONS = 2\nOPEN_LOG_FILE_AFTER_RUN = 0\n"},
        {"Bathymetry_Selection", "Hot_Start = false\n" + DataFileSection(bathymetryFile)},
        {"Area_Description", "True_land_value = 0\nReference_Level_Shift = 0\n"},
        {"Simulation_Period",
         "Time_step_count = 10\nTime_step_interval = 0.1\nWarm_up_period = 0\n"
         "Start_time = 2004, 1, 1, 0, 0, 0\n"},
        {"Equation_Parameters", "Deep_Water_Terms = false\nDispersion_Factor = 0\n"},
        {"SOLUTION_PARAMETERS", "Convective_terms_handle = 0\n"},
        {"MOVING_SHORELINE", "type = 0\n"},
        {"Bottom_Friction", "Resistance_Type = 0\n"},
        {"WAVE_BREAKING", "type = 0\n"},
        {"EXPLICIT_FILTERING", "type = 0\n"},
        {"EDDY_VISCOSITY", "Type = 0\n"},
        {"Porosity", "Porosity_Type = false\n"},
        {"Sponge", "Sponge_Type = false\n"},
        {"SURFACE_ELEVATION", "SURFACE_TYPE = 0\nConstant_Value = 0\n"},
        {"Boundary_Location", "Number_Of_Boundaries = 0\n"},
        {"Internal_Generation", "Number_Of_Records = 0\n"},
        {"Output_Deterministic_2D", "Number_Of_Records = 0\n"},
        {"Output_Statistic_2D", "Type = 0\n"},
        {"Output_Disturbance_2D", "Type = 0\n"},
        {"Output_Hotstart_2D", "Hot_Start = false\n"},
        // The outputs of the 1DH model, left out unless given.
        {"OUTPUT_DETERMINISTIC_1D", "-"},
        {"OUTPUT_STATISTIC_1D", "-"},
        {"OUTPUT_MOVING_SHORELINE_1D", "-"},
        {"OPTION_PARAMETERS", "HUD_update_2DH = 0\n"},
    };
    for (const auto& [name, body] : sections)
        EXPECT_TRUE(std::ranges::any_of(defaults, [&](const auto& d) { return d.first == name; }))
            << "ModelText: no section " << name;
    std::string text = "TARNEL_BOUSSINESQ_WAVE {\n";
    for (const auto& [name, fallback] : defaults) {
        const auto given = sections.find(name);
        const std::string& body = given != sections.end() ? given->second : fallback;
        if (body != "-") text += name + " {\n" + body + "}\n";
    }
    return text + "}\n";
}

DataFile ReadDataFile(const std::string& path) {
    DataFile d;
    XolFile f = XolOpenRead(path);
    size_t points = 1;
    for (int a = 0; a < f.dimension; ++a) points *= static_cast<size_t>(f.axes[a].count);
    std::vector<float> skip(points);
    if (f.noStaticItems > 0) d.firstStatic.resize(points);
    for (int s = 0; s < f.noStaticItems; ++s)
        XolReadStatic(f, s ? skip.data() : d.firstStatic.data());
    d.records.resize(static_cast<size_t>(std::max(f.noTimeSteps, 0)));
    for (auto& record : d.records) {
        record.assign(static_cast<size_t>(f.noDynamicItems), std::vector<float>(points));
        for (auto& item : record) XolReadDynamic(f, item.data());
    }
    XolClose(f);
    d.header = f;
    return d;
}

RunResult RunModel(const TempDir& dir, int steps, double dt,
                   std::map<std::string, std::string> sections) {
    std::ostringstream period;
    period << "Time_step_count = " << steps << "\nTime_step_interval = " << dt
           << "\nWarm_up_period = 0\nStart_time = 2004, 1, 1, 0, 0, 0\n";
    sections["Simulation_Period"] = period.str();
    WriteFile(dir / "m.bw", ModelText("bed.xol2", sections));
    return RunProgram({BuiltProgram("bw"), "m.bw"}, dir.path.string(),
                      {{"TARN_PROGRESS", "NONE"}, {"OMP_NUM_THREADS", "1"}}, {"BUILDMODE", "TRF"});
}

}  // namespace bwtest
