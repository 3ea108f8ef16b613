// The model reader: walks the model file's target once, from top to bottom,
// in a fixed order, reading every setting into the model's records. Later
// sections need what earlier ones fixed: the grid comes from the bathymetry,
// the number of steps sizes the series, and the state arrays exist before
// the maps and the initial surface are read into them.
#pragma once

#include <cstdint>
#include <string>

#include "platform/kvt/kvt.hpp"

constexpr const char* kModelTarget = "TARNEL_BOUSSINESQ_WAVE";

// The run-wide settings of the model file's first section.
struct BasicSettings {
    int32_t numberOfDimensions = 2;   // 2: the 2DH model; 1: the mesh solver
    int32_t deleteFemKvtFile = 1;     // read with one dimension only
    int32_t openLogFileAfterRun = 1;  // read and echoed, no further effect
};
extern BasicSettings gBasic;

// Bathymetry_Selection: the bathymetry file, which with a hot start is also
// the state of the earlier run.
struct BathymetrySettings {
    bool hotStart = false;
    std::string fileName;  // full path, trimmed
    int32_t itemCount = 0;
    int32_t itemNumbers[15] = {};
};
extern BathymetrySettings gBathymetry;

// The name, item count and item numbers of a DATA_FILE section.
struct DataFileRef {
    std::string fileName;  // full path, trimmed
    int32_t itemCount = 0;
    int32_t itemNumbers[15] = {};
    int32_t Item() const { return itemNumbers[0]; }  // the number that selects the item
};

// The second parameter file of a 1DH run, written by the model reader as its
// last act and opened by the mesh solver; empty with two dimensions.
extern std::string gMeshSolverFileName;

// Reads the reader's whole model setup from the opened parameter file;
// fileName is its path. Ends with the number of dimensions and all settings
// known, or stops the run. With one dimension it ends by writing the mesh
// solver's file beside the model file and closing the model file's tree.
void ReadModelSetup(KvtHandle file, const std::string& fileName);

// The sub-section DATA_FILE of parent: File_name, Item_Count (cut to
// maxItems) and the first Item_Count numbers of Item_Numbers.
DataFileRef ReadDataFile(KvtHandle parent, int32_t maxItems);

// Bathymetry_Selection: the grid, the map frame and bed.
void ReadBathymetry(KvtHandle target);
// Equation_Parameters; with two dimensions it allocates the state arrays.
void SetupEquation(KvtHandle target);
// SOLUTION_PARAMETERS.
void ReadSolutionParameters(KvtHandle target);
