#include "output/output_sections.hpp"

#include <algorithm>

#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "output/disturbance.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

StatisticSettings gStatisticOutput;
DisturbanceSettings gDisturbanceOutput;
HotstartOutputSettings gHotstartOutput;

namespace {

// The items of the statistics table and of the disturbance table.
constexpr int32_t kStatisticItems = 17;
constexpr int32_t kDisturbanceItems = 3;

void CheckInterval(int32_t interval, const char* section) {
    if (interval < 1) StopRun(std::string(section) + ": Time_Step_Interval must be at least 1");
}

}  // namespace

void SetupOutputStatistic2D(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Output_Statistic_2D");
    StatisticSettings& s = gStatisticOutput;
    s = StatisticSettings{};
    KvtGetInteger(section, "Type", s.type);
    if (s.type <= 0) return;
    KvtGetInteger(section, "Type_of_mean_calculation", s.meanCalculation);
    KvtGetInteger(section, "First_Time_step", s.firstStep);
    KvtGetInteger(section, "Last_Time_step", s.lastStep);
    KvtGetInteger(section, "Time_Step_Interval", s.stepInterval);
    CheckInterval(s.stepInterval, "Output_Statistic_2D");
    KvtGetInteger(section, "Number_of_First_Wave", s.firstWave);
    KvtGetReal(section, "Eps_High", s.epsHigh);
    KvtGetReal(section, "Eps_Low", s.epsLow);
    KvtGetInteger(section, "Number_Of_Records", s.numberOfRecords);
    s.numberOfRecords = std::max(s.numberOfRecords, 0);
    OutputSpecKeys keys;
    keys.timeSpan = false;
    keys.typeOfLand = false;
    keys.maxItem = kStatisticItems;
    for (int32_t n = 1; n <= s.numberOfRecords; ++n) {
        // Record by record, as the deterministic records are read.
        OutputRecord2D& r = s.records.emplace_back();
        ReadOutputSpec(section, n, keys, r);
        r.firstStep = s.firstStep, r.lastStep = s.lastStep, r.stepInterval = s.stepInterval;
    }
}

void SetupOutputDisturbance2D(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Output_Disturbance_2D");
    DisturbanceSettings& d = gDisturbanceOutput;
    d = DisturbanceSettings{};
    KvtGetInteger(section, "Type", d.type);
    if (d.type <= 0) return;
    KvtGetInteger(section, "First_Time_Step", d.firstStep);
    KvtGetInteger(section, "Last_Time_Step", d.lastStep);
    KvtGetInteger(section, "Time_Step_Interval", d.stepInterval);
    CheckInterval(d.stepInterval, "Output_Disturbance_2D");
    KvtGetInteger(section, "Number_of_first_wave", d.firstWave);
    KvtGetInteger(section, "Scaling_Type", d.scalingType);
    if (d.scalingType == 1)
        KvtGetReal(section, "Incoming_Wave_Height", d.incomingHeight);
    else
        KvtGetIntegerList(section, "Grid_Point", d.gridPoint, 2);
    if (d.scalingType != 1 && (d.gridPoint[0] < 0 || d.gridPoint[0] > gGrid.J ||
                               d.gridPoint[1] < 0 || d.gridPoint[1] > gGrid.K))
        StopRun(Filled(
            Filled("Output_Disturbance_2D: Grid_Point (%,%) lies outside the grid", d.gridPoint[0]),
            d.gridPoint[1]));
    KvtGetReal(section, "Eps_High", d.epsHigh);
    KvtGetReal(section, "Eps_Low", d.epsLow);
    KvtGetInteger(section, "Number_of_Items", d.numberOfItems);
    d.numberOfItems = std::clamp(d.numberOfItems, 1, kDisturbanceItems);
    d.itemNumbers.resize(static_cast<size_t>(d.numberOfItems));
    for (int32_t i = 0; i < d.numberOfItems; ++i) d.itemNumbers[i] = i + 1;
    KvtGetIntegerList(section, "Item_Numbers", d.itemNumbers.data(), d.numberOfItems);
    for (int32_t item : d.itemNumbers)
        if (item < 1 || item > kDisturbanceItems) StopRun("rmsWriteToFile: Wrong type of item");
    d.title = KvtTrimmedString(section, "Title", 40);
    d.fileName = KvtTrimmedFilename(section, "File_Name", 255);
    KvtGetInteger(section, "Type_of_Area_Statistic", d.areaStatistic);
    if (d.areaStatistic > 0) {
        d.areaFileName = KvtTrimmedFilename(section, "File_Name_Area_Statistic", 255);
        const DataFileRef ref = ReadDataFile(section, 3);
        d.codeMapFile = ref.fileName;
        d.codeMapItem = ref.Item();
        SetupDisturbanceAreas();
    }
}

void SetupOutputHotstart2D(KvtHandle target) {
    HotstartOutputSettings& h = gHotstartOutput;
    h = HotstartOutputSettings{};
    h.firstStep = h.lastStep = h.stepInterval = gGrid.timeStepCount;
    const KvtHandle section = KvtOpenSection(target, "Output_Hotstart_2D");
    KvtGetLogical(section, "Hot_Start", h.hotStart);
    if (!h.hotStart) return;
    h.title = KvtTrimmedString(section, "Title", 40);
    h.fileName = KvtTrimmedFilename(section, "File_Name", 256);
    KvtGetInteger(section, "First_Time_Step", h.firstStep);
    KvtGetInteger(section, "Last_Time_Step", h.lastStep);
    KvtGetInteger(section, "Time_Step_Interval", h.stepInterval);
}
