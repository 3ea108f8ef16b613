// Deterministic output: the instantaneous state of the 2DH model written to
// point series (xol0), lines (xol1) and areas (xol2), each file with its own
// sub-grid, time span and items.
//
// The time loop calls CreateOutputDeterministic before the first step,
// WriteOutputDeterministic after each step and CloseOutputDeterministic after
// the last. A record whose first step is 0 has the state before the first step
// written when its file is created, so that the first record of the file is
// the one its time axis starts with.
//
// The record layout, the reading of an Output_Spec_Data_% section and the
// making of a file's header are shared with the other map outputs.
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
    std::vector<float> values;  // one item over the sub-grid, made with the file
};

struct DeterministicOutput {
    int32_t numberOfRecords = 0;
    std::vector<OutputRecord2D> records;
};
extern DeterministicOutput gOutputDet;

void SetupOutputDeterministic2D(KvtHandle target);
void CreateOutputDeterministic();
void WriteOutputDeterministic(int32_t step);
// Flushes, closes and summarises every open file; a second call does nothing.
void CloseOutputDeterministic();

// One item of an output table: name, type and unit codes.
struct OutputItemInfo {
    const char* name;
    int32_t type;
    int32_t unit;
    const char* standardName = nullptr;  // the CF standard name, where one fits
};
// The twelve items of the deterministic output, item n at index n - 1.
extern const OutputItemInfo kDeterministicItems[12];

// Which keys an Output_Spec_Data_% section holds besides the common ones.
struct OutputSpecKeys {
    bool timeSpan = true;    // First_Time_step, Last_Time_step, Time_Step_Interval
    bool typeOfLand = true;  // Type_Of_Land
    int32_t maxItem = 12;    // item numbers must lie in 1..maxItem
};
// Reads section Output_Spec_Data_<number> of parent into r, with the file
// type from the extension, the checks of ranges and items, and the dimension.
void ReadOutputSpec(KvtHandle parent, int32_t number, const OutputSpecKeys& keys,
                    OutputRecord2D& r);

// The file type that an output file's extension gives: 0, 1, 2, or -1.
int32_t OutputTypeFromExtension(const std::string& fileName);

// The sub-grid of one point of a record (a line or area has one: its ranges).
struct OutputSubGrid {
    int32_t j0 = 0, dj = 1, nx = 1;
    int32_t k0 = 0, dk = 1, ny = 1;
    size_t Size() const { return static_cast<size_t>(nx) * static_cast<size_t>(ny); }
};
OutputSubGrid RecordSubGrid(const OutputRecord2D& r, int32_t point);
// Points of a record: NO_OF_POINTS for a point series, else 1.
int32_t RecordPoints(const OutputRecord2D& r);

// Makes the header and the file of a record: items from the table (named
// "P(j,k): name" with more than one point), spatial axes, calendar time axis
// from startStep with stepInterval steps between records, the data-type flag,
// the land value, the projection of an area, and for an area the static
// "Bathymetry" (with the delete value on land when the record's Type_Of_Land is 1).
void CreateOutputRecordFile(OutputRecord2D& r, const OutputItemInfo* table, int32_t startStep,
                            int32_t stepInterval, int32_t dataType);
// The calendar time axis of a map file whose first record is step
// startStep, with stepInterval steps between records.
void SetStepTimeAxis(XolFile& file, int32_t startStep, int32_t stepInterval);
// The projection of a map file whose origin lies at (x, y) metres from grid
// point (0,0): the grid's projection, the geographical position of that
// place and the true north there, which it returns.
struct GridPlace {
    double longitude = 0.0, latitude = 0.0, north = 0.0;
};
GridPlace SetGridProjection(XolFile& file, double x, double y);
