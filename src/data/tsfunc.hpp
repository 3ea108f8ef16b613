// The store of scalar time series: one value for each time step and each
// boundary quantity, all known before the run starts. A setup routine hands
// in a whole series and gets back a small integer; in the time loop one row of
// all series is in memory at a time, and a series is asked for by its integer.
// The store lives on two scratch files, so that memory holds one row however
// long the run: adding a series copies the store from one file to the other
// with one more column.
#pragma once

#include <cstdint>
#include <cstdio>
#include <vector>

constexpr float kTsNoValue = 3.4028235e38f;  // what an id without a series gives

struct TsState {
    int32_t tsSteps = 0;       // rows: Time_step_count + 1
    int32_t tsNextId = 1;      // the id of the next series; the store has tsNextId - 1 columns
    int32_t tsPosition = -1;   // -1 before reading starts; else the step of the row in memory
    std::vector<float> tsRow;  // the row in memory
    FILE* tsFileA = nullptr;   // the two scratch files
    FILE* tsFileB = nullptr;
    FILE* tsFile = nullptr;  // the one that holds the whole store once reading starts
};
extern TsState gTs;

// Sets the number of rows; called once as the model setup begins.
void TsInit(int32_t rows);
// Adds a series of tsSteps values (step 0 first) and gives its id.
void TsAddSeries(int32_t& id, const float* values);
// Brings the row of a step into memory: steps 1, 2, 3, ... one after the other.
void TsReadStep(int32_t step);
// The value of series id in the row in memory; kTsNoValue for id 0 or no series.
float TsValue(int32_t id);
// Closes the scratch files and forgets every series.
void TsReset();
