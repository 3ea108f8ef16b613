// The outputs of a 1DH run as the model file states them: point series and
// lines of the deterministic output, the wave statistics and the moving
// shoreline. The model reader only reads them; they reach the mesh solver
// through its own parameter file (translation.hpp).
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/kvt/kvt.hpp"

// The lists a 1DH output record belongs to.
constexpr int32_t kOutputListDeterministic = 1;
constexpr int32_t kOutputListStatistic = 2;
constexpr int32_t kOutputListShoreline = 3;

// One output file of a 1DH run, a section OUTPUT_SPEC_DATA_% of the model file.
struct OutputRecord1D {
    int32_t list = kOutputListDeterministic;  // 1, 2 or 3
    int32_t first = 0, last = 0;              // grid indices of a line
    int32_t points = 1;                       // points of a line, or of a point series
    int32_t kind = 0;                         // 0 a series of points, 1 or 2 a line
    std::vector<int32_t> pointIndices;        // the grid indices of a point series
    int32_t firstStep = 0, lastStep = 0, stepInterval = 1;  // default: every step of the run
    int32_t numberOfItems = 1;
    std::vector<int32_t> itemNumbers;  // default 1, 2, ..., numberOfItems
    std::string fileName;              // full path
    std::string title;                 // at most 40 characters
};

// The keys of OUTPUT_STATISTIC_1D beside its records.
struct WaveStatistic1D {
    int32_t type = 1;
    int32_t meanCalculation = 1;
    int32_t firstStep = 0, lastStep = 0, stepInterval = 1;  // default: every step of the run
    int32_t firstWave = 0;
    float epsHigh = 1.0e-4f, epsLow = -1.0e-4f;
};

struct OutputInfo1D {
    std::vector<OutputRecord1D> deterministic;  // list 1
    std::vector<OutputRecord1D> statistic;      // list 2
    std::vector<OutputRecord1D> shoreline;      // list 3: none or one
    WaveStatistic1D statistics;
    bool includeShoreline = false;
};
extern OutputInfo1D gOutput1D;

// Reads OUTPUT_DETERMINISTIC_1D, OUTPUT_STATISTIC_1D and
// OUTPUT_MOVING_SHORELINE_1D, in this order.
void SetupOutputInfo1D(KvtHandle target);
// Reads the record section OUTPUT_SPEC_DATA_<number> of parent for the given
// list; stops with "OutputInfo_1DH: Wrong type of output" for a list other
// than 1, 2 or 3. A record of the statistics list takes the time range of
// its section as the default of its own.
OutputRecord1D ReadOutputInfo1DH(KvtHandle parent, int32_t list, int32_t number);
