#include "meshsolver/output_info.hpp"

#include <algorithm>
#include <new>

#include "input/kvt_access.hpp"
#include "output/deterministic.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

OutputInfo1D gOutput1D;

namespace {

constexpr const char* kWho = "SetupOutputInfo1D: ";

std::string RecordText(int32_t number) {
    return " of record " + std::to_string(number);
}

void AtLeastOne(int32_t value, const char* key, int32_t number) {
    if (value < 1) StopRun(kWho + std::string(key) + RecordText(number) + " must be at least 1");
}

// A list of integers of which the record needs count values: fewer given
// (none at all for a single value is a default of 0) can't be meant.
std::vector<int32_t> ReadList(KvtHandle section, const char* key, int32_t count, int32_t number) {
    const int given = KvtParamCount(section, key);
    if (given < count && (given > 0 || count > 1))
        StopRun(kWho + std::string(key) + RecordText(number) + " holds " + std::to_string(given) +
                " values where " + std::to_string(count) + " are needed");
    std::vector<int32_t> values;
    try {
        values.assign(static_cast<size_t>(count), 0);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    KvtGetIntegerList(section, key, values.data(), count);
    return values;
}

// Grid indices of the bathymetry line: 0 to J.
void CheckIndex(int32_t index, const char* what, int32_t number) {
    if (index < 0 || index > gGrid.J)
        StopRun(Filled(Filled(kWho + std::string(what) + RecordText(number) +
                                  " is % and lies outside the grid (0..%)",
                              index),
                       gGrid.J));
}

void ReadRecords(KvtHandle section, int32_t list, int32_t count,
                 std::vector<OutputRecord1D>& records) {
    // Record by record as their sections are found: a count beyond the
    // sections stops at the first one missing, before room for it is taken.
    for (int32_t n = 1; n <= count; ++n) records.push_back(ReadOutputInfo1DH(section, list, n));
}

}  // namespace

OutputRecord1D ReadOutputInfo1DH(KvtHandle parent, int32_t list, int32_t number) {
    if (list != kOutputListDeterministic && list != kOutputListStatistic &&
        list != kOutputListShoreline)
        StopRun("OutputInfo_1DH: Wrong type of output");
    const KvtHandle section = KvtOpenSection(parent, Filled("OUTPUT_SPEC_DATA_%", number));
    OutputRecord1D r;
    r.list = list;
    // Without a time range of its own a record covers the whole run, each
    // step: what a file of a profile's run is wanted for.
    r.firstStep = 0, r.lastStep = gGrid.timeStepCount, r.stepInterval = 1;
    if (list == kOutputListStatistic) {
        const WaveStatistic1D& s = gOutput1D.statistics;
        r.firstStep = s.firstStep, r.lastStep = s.lastStep, r.stepInterval = s.stepInterval;
    }
    r.fileName = KvtTrimmedFilename(section, "File_Name", 256);
    r.kind = OutputTypeFromExtension(r.fileName);
    if (r.kind < 0) StopRun("SetupOutputInfo1D: Wrong file extension");
    KvtGetInteger(section, "type", r.kind);
    if (list != kOutputListShoreline) {
        if (r.kind > 0) {
            const std::vector<int32_t> range = ReadList(section, "X_Range_And_Interval", 2, number);
            r.first = range[0], r.last = range[1];
            KvtGetInteger(section, "No_of_points", r.points);
            CheckIndex(r.first, "the first index of X_Range_And_Interval", number);
            CheckIndex(r.last, "the last index of X_Range_And_Interval", number);
            AtLeastOne(r.points, "No_of_points", number);
        } else {
            KvtGetInteger(section, "NO_OF_POINTS", r.points);
            AtLeastOne(r.points, "NO_OF_POINTS", number);
            r.pointIndices = ReadList(section, "X_Range_And_Interval", r.points, number);
            for (int32_t index : r.pointIndices)
                CheckIndex(index, "a point of X_Range_And_Interval", number);
            r.first = r.pointIndices.front(), r.last = r.pointIndices.back();
        }
    }
    KvtGetInteger(section, "First_Time_step", r.firstStep);
    KvtGetInteger(section, "Last_Time_step", r.lastStep);
    KvtGetInteger(section, "Time_Step_Interval", r.stepInterval);
    AtLeastOne(r.stepInterval, "Time_Step_Interval", number);
    KvtGetInteger(section, "Number_Of_Items", r.numberOfItems);
    AtLeastOne(r.numberOfItems, "Number_Of_Items", number);
    try {
        r.itemNumbers.resize(static_cast<size_t>(r.numberOfItems));
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    for (int32_t i = 0; i < r.numberOfItems; ++i) r.itemNumbers[i] = i + 1;
    KvtGetIntegerList(section, "Item_Numbers", r.itemNumbers.data(), r.numberOfItems);
    r.title = KvtTrimmedString(section, "Title", 40);
    return r;
}

void SetupOutputInfo1D(KvtHandle target) {
    OutputInfo1D& o = gOutput1D;
    o = OutputInfo1D{};

    const KvtHandle deterministic = KvtOpenSection(target, "OUTPUT_DETERMINISTIC_1D");
    int32_t count = 0;
    KvtGetInteger(deterministic, "Number_Of_Records", count);
    ReadRecords(deterministic, kOutputListDeterministic, count, o.deterministic);

    const KvtHandle statistic = KvtOpenSection(target, "OUTPUT_STATISTIC_1D");
    WaveStatistic1D& s = o.statistics;
    count = 0;
    KvtGetInteger(statistic, "Number_Of_Records", count);
    KvtGetInteger(statistic, "Type", s.type);
    KvtGetInteger(statistic, "Type_of_mean_calculation", s.meanCalculation);
    s.firstStep = 0, s.lastStep = gGrid.timeStepCount;
    KvtGetInteger(statistic, "First_Time_Step", s.firstStep);
    KvtGetInteger(statistic, "Last_Time_Step", s.lastStep);
    KvtGetInteger(statistic, "Time_Step_Interval", s.stepInterval);
    if (s.stepInterval < 1)
        StopRun("SetupOutputInfo1D: Time_Step_Interval of OUTPUT_STATISTIC_1D must be at least 1");
    KvtGetInteger(statistic, "Number_Of_First_Wave", s.firstWave);
    KvtGetReal(statistic, "Eps_High", s.epsHigh);
    KvtGetReal(statistic, "Eps_Low", s.epsLow);
    ReadRecords(statistic, kOutputListStatistic, count, o.statistic);

    const KvtHandle shoreline = KvtOpenSection(target, "OUTPUT_MOVING_SHORELINE_1D");
    KvtGetLogical(shoreline, "INCLUDE_CALCULATION", o.includeShoreline);
    if (o.includeShoreline) ReadRecords(shoreline, kOutputListShoreline, 1, o.shoreline);
}
