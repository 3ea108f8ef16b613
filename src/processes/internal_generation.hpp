// Internal wave generation: waves born on straight lines of points inside
// the grid, by a prescribed flux added to the continuity equation there.
// Every point of a line gets a number; the flat vectors below hold the source
// values of those numbers, renewed at each half step, and the sweeps and the
// surface extrapolation read them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "data/xolfile.hpp"
#include "platform/kvt/kvt.hpp"

struct InternalGenRecord {
    int32_t pointCount = 0;  // np: the number of points less 1
    int32_t waveType = 0;    // 0: one value from a series; else a line file
    int32_t seriesId = 0, deepSeriesId = 0;
    std::vector<int32_t> pointJ, pointK;  // 0..np
    std::string fileName;
    int32_t itemCount = 0;
    int32_t itemNumbers[2] = {0, 0};
    float lineNew = 0.0f, lineHalf = 0.0f, deepNew = 0.0f, deepHalf = 0.0f;
};

// The line file of a record whose waveType is not 0, read forward during the
// run with two records in memory, each np + 1 values.
struct InternalLineFile {
    XolFile file;
    std::vector<float> older, newer;          // item 1, the main value
    std::vector<float> deepOlder, deepNewer;  // item 2, with Deep_Water_Terms only
    double olderTime = 0.0;  // seconds from the simulation start of the older record
    double fileStep = 0.0;   // seconds between the file's records
    int32_t records = 0;     // records in the file
    int32_t read = 0;        // records read so far
};

struct GenerationState {
    int32_t numberOfRecords = 0;  // above 0: internal generation is active
    std::vector<InternalGenRecord> records;
    std::vector<int32_t> sourceIndex;  // over the grid; 0 none, else the number from 1
    int32_t sourceCount = 0;
    // Flat vectors, element 0 unused so that number i stands at index i.
    std::vector<float> sourceP, sourcePPrev, sourcePPrev2;
    std::vector<float> sourceQ, sourceQPrev, sourceQPrev2;
    std::vector<float> sourceXiX, sourceXiY;  // with Deep_Water_Terms only
    int32_t genJ1 = 0, genJ2 = 0, genK1 = 0, genK2 = 0;
    std::vector<InternalLineFile> lineFiles;    // record r at index r - 1; open for waveType != 0
    std::vector<float> lineValues, deepValues;  // max(J, K) + 1 values along a line
};
extern GenerationState gGeneration;

void SetupInternalGeneration(KvtHandle target);
// The source values of step n for the half step of the axis (1 before the
// x half, 2 before the y half): the vectors of that direction shift back a
// level, and the lines get the value of the middle (x) or end (y) of the step.
void UpdateInternalGeneration(int32_t step, int32_t axis);
// The kind of a record's line from its ends: 1 along k (or a single point),
// feeding x; 2 along j, feeding y; 3 oblique, feeding nothing.
int32_t LineKind(const InternalGenRecord& record);
// The number of the source at grid point p (index into a field), 0 when
// internal generation is off or the point has none.
inline int32_t SourceAt(size_t p) {
    return gGeneration.numberOfRecords > 0 ? gGeneration.sourceIndex[p] : 0;
}
