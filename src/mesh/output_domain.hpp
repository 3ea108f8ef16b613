// Output domains of the mesh solver: the places at which an output file
// wants values (a list of points or an equidistant line along the mesh),
// the element that holds each place, the data file with its header, and the
// extraction of a nodal vector at the places.
//
// On a line mesh a place at x inside element e takes the straight line
// between the values at the element's two ends a and b:
//     v(x) = ((va - vb) / (a - b)) x + (a vb - b va) / (a - b),
// so a quadratic element is read as linear between its ends. A place that
// no element holds, or an end that holds the delete value, gives the delete
// value.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "data/xolfile.hpp"
#include "mesh/mesh.hpp"
#include "run/datetime.hpp"

// One place of an output file: the element that holds it (0: none) and its
// position; y and z (the bed level) are interpolated from the mesh's nodes.
struct OutputPlace {
    int32_t element = 0;
    double x = 0.0, y = 0.0, z = 0.0;
};

// One item of an output file: its table entry and where its values come from.
// A vector that is absent or empty stands for `fallback` at every node (a
// process that is switched off).
struct OutputItemBW {
    int32_t number = 0;  // the number in the kind's table
    std::string name;    // at most 80 characters
    int32_t type = 999, unit = 0;
    const char* standardName = nullptr;
    int32_t mesh = 1;  // into gMeshes
    const std::vector<double>* vector = nullptr;
    double fallback = 0.0;
};

// One output file of the mesh solver, a section OUTPUT_FILE_% of its file.
struct OutputFile {
    std::string file_name;
    std::string title;
    int32_t type = 1;    // 1 fields, 2 wave statistics, 3 runup
    int32_t format = 2;  // 0 a list of points, 1 a line
    double delete_value = 1.0e-35;
    double land_value = 10.0;
    int32_t flood_and_dry = 1;
    int32_t precision = 2;
    int32_t interpolation_type = 1;
    int32_t interpolation_subtype = 1;
    int32_t first_time_step = 0, last_time_step = 0, time_step_frequency = 1;
    int32_t number_of_variables = 0;
    std::vector<int32_t> type_of_variables;

    // The run's time axis, given with the defaults: the file's calendar axis
    // starts first_time_step steps after startDate.
    DateTime startDate;
    double timeStepInterval = 0.0;

    bool active = true;         // false once the domain turned out empty
    int32_t valueLocation = 1;  // 1 values at nodes
    int32_t pointCount = 1;     // places of a point file; 1 for a line
    std::vector<OutputPlace> places;
    std::vector<std::string> pointNames;
    std::string projection;
    int32_t x_npoints = 0;  // 0 for a point file
    double x_ds = 0.0, x_origo = 0.0;

    std::vector<OutputItemBW> items;
    std::vector<double> statWork;  // type 2: one statistic on the elevation mesh
    // Room for one item at all places, made at setup so that writing
    // allocates nothing.
    std::vector<double> extracted;
    std::vector<float> values;
    XolFile file;
};

// The keys of the open OUTPUT_FILE_% section, in their order, over the
// defaults the record holds. Under a launcher the name gets "_p" and the
// process id behind its stem.
void SpecOutputDomain(OutputFile& record, int32_t valueLocation = 1);
// Called once the items are known: the places of a point file (format 0) or
// of a line (format 1) on the mesh of the first item, and room for the values.
void SetupOutputDomain(OutputFile& record);
void SetupPointDomain(OutputFile& record);
void SetupAreaDomain(OutputFile& record);
// The first element whose ends hold x, both ends included (to a millionth of
// its length), so that a place on a node between two elements is the left
// one's; 0 when none does.
void FindLineElement(int32_t& element, double x, const Mesh& mesh);
// The two-node rule between the ends (a, va) and (b, vb) of an element.
double TwoNodeValue(double x, double a, double b, double va, double vb, double deleteValue);
// One item at all places: values[p] from the vector (1-based on the mesh's
// nodes) at place p.
void ExtractData(int32_t interpolationType, int32_t valueLocation,
                 const std::vector<OutputPlace>& places, const Mesh& mesh,
                 const std::vector<double>& vector, double* values, double deleteValue);
// The number of items in the data file: each record item once per place of
// a point file, once for a line or a runup series.
int32_t FileItemCount(const OutputFile& record);
// Creates the data files of the active records: xol0 to xol3; files of
// other extensions are passed over.
void OpenOutputFiles(int32_t count, std::vector<OutputFile>& records);
// Closes the files of the active records and summarises them in the log.
void CloseOutputFiles(int32_t count, std::vector<OutputFile>& records);
// The extension of a file name behind its last dot, "" when it has none.
std::string FileExtension(const std::string& name);
