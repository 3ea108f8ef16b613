// Open boundaries: straight grid lines along which the model is driven from
// outside by a surface elevation (level boundary, grid mark 6) or a flux
// (flux boundary, mark 7). The driving data are one value for the whole line
// from a 0-dimensional series, a value per point from a line file, or the hot
// transfer data of an earlier run. Once a step they become a small table of
// values along the line, the only hand-over to the sweeps.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "data/xolfile.hpp"
#include "platform/kvt/kvt.hpp"

struct BoundaryRecord {
    int32_t first[2] = {0, 0};  // (j, k), each coordinate at most that of last
    int32_t last[2] = {0, 0};
    int32_t orientation = 0;        // 1 west, 2 north, 3 east, 4 south
    int32_t formulation = 0;        // 0 level, 1 flux
    int32_t dataSpecification = 0;  // 0 series, 1 line file, 2 hot transfer data
    int32_t seriesId = 0, deepSeriesId = 0;
    std::string fileName;
    int32_t itemCount = 0;
    int32_t itemNumbers[4] = {0, 0, 0, 0};
};

// The values of one boundary: a row for each point along the line (s = 0 at
// first), six columns (1..6). Value(s, c) is the table's (s, c).
struct BoundaryTable {
    int32_t rows = 0;
    std::vector<float> values;  // rows * 6, row-major
    float& Value(int32_t s, int32_t column) {
        return values[static_cast<size_t>(s) * 6 + column - 1];
    }
    float Value(int32_t s, int32_t column) const {
        return values[static_cast<size_t>(s) * 6 + column - 1];
    }
};

// A line file read forward during the run, two records in memory.
struct BoundaryLineFile {
    XolFile file;
    int32_t itemsInFile = 0;
    std::vector<float> older, newer;          // itemsInFile * points, item by item
    double olderTime = 0.0, newerTime = 0.0;  // seconds from the file's start
    double fileStep = 0.0;
    double simulationOffset = 0.0;  // simulation start less the file's start, seconds
    int32_t recordsRead = 0;
};

struct BoundaryState {
    int32_t numberOfBoundaries = 0;
    std::vector<BoundaryRecord> records;        // record b at index b - 1
    std::vector<BoundaryTable> boundaryValues;  // the same numbering
    std::vector<BoundaryLineFile>
        lineFiles;  // the same numbering; used with dataSpecification 1, 2
};
extern BoundaryState gBoundaries;

void SetupOpenBoundaries(KvtHandle target);
// Renews the tables for step n; called once a step after TsReadStep.
void UpdateBoundaryData(int32_t step);
// Fills series[step * count + e] for steps 0..timeStepCount and e = 0..count-1
// from items[e] of a 0-dimensional file; methods[e]: 1 linear, 2 cubic, 3 directional.
void ReadTimeSeries0D(const std::string& path, int32_t count, const int32_t* items,
                      const int32_t* methods, std::vector<float>& series);
// The table of boundary b (from 1).
inline BoundaryTable& BoundaryValues(int32_t b) {
    return gBoundaries.boundaryValues[b - 1];
}
inline const BoundaryRecord& Boundary(int32_t b) {
    return gBoundaries.records[b - 1];
}
