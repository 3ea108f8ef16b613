// Small models for the tests: data files of bathymetry, maps and boundary
// series written through the data-file layer, and the text of a complete
// model file whose sections can be replaced one by one.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "support/test_support.hpp"

namespace bwtest {

// A map over (0..J, 0..K), values x fastest, one item, one step, on the
// given projection ("NON-UTM" is a plain local frame).
struct MapSpec {
    int J = 10, K = 10;
    float dx = 1.0f, dy = 1.0f;
    std::string projection = "NON-UTM";
    double longitude = 0.0, latitude = 0.0, orientation = 0.0;
    std::string itemName = "Bathymetry";
    int dataType = 0;
};
void WriteMapFile(const std::string& path, const MapSpec& grid, const std::vector<float>& values);
// A map of one value everywhere.
std::vector<float> Constant(const MapSpec& grid, float value);

// A 0-dimensional series file: items[i][n] is item i at start + n*step seconds.
void WriteSeriesFile(const std::string& path, const std::string& start, double step,
                     const std::vector<std::vector<float>>& items,
                     const std::vector<std::string>& names = {});
// A 1-dimensional line file: items[i][n][s] is item i at step n and point s.
void WriteLineFile(const std::string& path, const std::string& start, double step, float spacing,
                   const std::vector<std::vector<std::vector<float>>>& items, int dataType = 0,
                   const std::vector<std::string>& names = {});

// A line file of `points` points holding the same value at each:
// items[i][n] is item i at step n.
void WriteUniformLineFile(const std::string& path, const std::string& start, double step,
                          float spacing, int points, const std::vector<std::vector<float>>& items);
// count samples, dt apart from 0, of a sine of amplitude a and period T whose
// amplitude rises linearly over its first rampPeriods periods.
std::vector<float> RampedSine(double a, double T, double dt, size_t count, double rampPeriods);

// The text of a model file that holds every section of the tree in its
// order. Each section's body has a working default (a cold start at level 0,
// no processes, no outputs); sections[name] replaces the body of a section,
// and a body of "-" leaves the section out. The bathymetry file is named by
// bathymetryFile, relative to the model file's folder.
std::string ModelText(const std::string& bathymetryFile,
                      const std::map<std::string, std::string>& sections = {});

// The sections of a 1DH model over those of `given`: one dimension, the
// sections of the grid model that a profile does not read left out, its three
// output sections without records.
std::map<std::string, std::string> ProfileSections(std::map<std::string, std::string> given = {});

// The body of a DATA_FILE section naming a file with item 1.
std::string DataFileSection(const std::string& file, int item = 1);
// One INTERNAL_GEN_DATA_n record: the line (j1,k1)..(j2,k2) fed by items 1
// and 2 of file.
std::string GenerationRecord(int n, int j1, int k1, int j2, int k2, int waveType,
                             const std::string& file);

// A data file read back: its header, its first static item (if any) and
// every record of every dynamic item, records[record][item][point].
struct DataFile {
    XolFile header;
    std::vector<float> firstStatic;
    std::vector<std::vector<std::vector<float>>> records;
};
DataFile ReadDataFile(const std::string& path);

// Writes dir/m.bw, ModelText("bed.xol2", sections) with `steps` steps of dt
// from 2004-01-01 00:00:00, and runs the engine on it in dir.
RunResult RunModel(const TempDir& dir, int steps, double dt,
                   std::map<std::string, std::string> sections);

// Writes `sections` as the body of a model file in dir and hands the file's
// top section to setup (a Setup... function of the model reader).
template <typename Setup>
void SetupFromText(const TempDir& dir, const std::string& sections, Setup setup) {
    WriteFile(dir / "m.bw", "TARNEL_BOUSSINESQ_WAVE {\n" + sections + "}\n");
    KvtHandle file = KvtOpenFile(dir / "m.bw", false);
    setup(KvtOpenTarget(file, "TARNEL_BOUSSINESQ_WAVE"));
    kvtClose(&file);
}

}  // namespace bwtest
