// The model reader: walks the model file's target once, from top to bottom,
// in a fixed order, reading every setting into the model's records.
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

// Reads the whole model setup from the opened parameter file; fileName is
// its path. Ends with the number of dimensions and all settings known.
void ReadModelSetup(KvtHandle file, const std::string& fileName);
