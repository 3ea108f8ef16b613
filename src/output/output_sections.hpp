// The settings of the map outputs that follow the deterministic one: wave
// statistics, wave disturbance and the hot-start file. Their sections are
// read and checked with the rest of the model file, so that the log holds
// every setting in force; writing them is the business of their own outputs.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "output/deterministic.hpp"
#include "platform/kvt/kvt.hpp"

// Output_Statistic_2D.
struct StatisticSettings {
    int32_t type = 1;  // 0 or less: no statistics
    int32_t meanCalculation = 1;
    int32_t firstStep = 0, lastStep = 0, stepInterval = 1;
    int32_t firstWave = 0;
    float epsHigh = 1.0e-4f, epsLow = -1.0e-4f;
    int32_t numberOfRecords = 0;
    std::vector<OutputRecord2D> records;
};
extern StatisticSettings gStatisticOutput;

// Output_Disturbance_2D.
struct DisturbanceSettings {
    int32_t type = 1;  // 0 or less: no output
    int32_t firstStep = 0, lastStep = 0, stepInterval = 1;
    int32_t firstWave = 0;
    int32_t scalingType = 0;  // 1: incomingHeight given; else taken at gridPoint
    float incomingHeight = 0.0f;
    int32_t gridPoint[2] = {0, 0};
    float epsHigh = 1.0e-4f, epsLow = -1.0e-4f;
    int32_t numberOfItems = 1;
    std::vector<int32_t> itemNumbers;
    std::string title, fileName;
    int32_t areaStatistic = 0;  // above 0: the area report is written
    std::string areaFileName;
    std::string codeMapFile;
    int32_t codeMapItem = 1;
};
extern DisturbanceSettings gDisturbanceOutput;

// Output_Hotstart_2D.
struct HotstartOutputSettings {
    bool hotStart = false;
    std::string title, fileName;
    int32_t firstStep = 0, lastStep = 0, stepInterval = 0;  // defaults: the run's last step
};
extern HotstartOutputSettings gHotstartOutput;

void SetupOutputStatistic2D(KvtHandle target);
void SetupOutputDisturbance2D(KvtHandle target);
// Sets the defaults of first, last and interval to the last step index, then
// reads the section.
void SetupOutputHotstart2D(KvtHandle target);
