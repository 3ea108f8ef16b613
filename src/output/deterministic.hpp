// Deterministic output: the instantaneous state of the 2DH model written to
// point series (xol0), lines (xol1) and areas (xol2), each file with its own
// sub-grid, time span and items.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "data/xolfile.hpp"
#include "platform/kvt/kvt.hpp"

struct OutputRecord2D {
    std::string fileName;
    int32_t type = 0;  // 0 point series, 1 line, 2 area
    int32_t noOfPoints = 1;
    std::vector<int32_t> xRange, yRange;  // first, last, interval (points: the indices)
    int32_t firstStep = 0, lastStep = 0, stepInterval = 1;
    int32_t numberOfItems = 1;
    std::vector<int32_t> itemNumbers;
    std::string title;
    int32_t typeOfLand = 0;
    int32_t dimension = 0;
    XolFile file;
};

struct DeterministicOutput {
    int32_t numberOfRecords = 0;
    std::vector<OutputRecord2D> records;
};
extern DeterministicOutput gOutputDet;

void SetupOutputDeterministic2D(KvtHandle target);
void CreateOutputDeterministic();
void WriteOutputDeterministic(int32_t step);
void CloseOutputDeterministic();
