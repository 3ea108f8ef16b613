// Internal wave generation: the setup. Each record is a straight line of
// points between two ends, rounded onto the grid one point for each step
// along its longer side. Every point of a line, and its neighbour one up in
// j (a line along k) or in k (a line along j), gets a number in the flat
// source vectors, so that the line's two rows of points both gain water.
// A record's values come from a 0-dimensional series (one value for the
// whole line) or from a line file of np + 1 values, item 1 the main value
// and item 2 the deep-water value.
#include "processes/internal_generation.hpp"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <new>

#include "data/tsfunc.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "processes/open_boundaries.hpp"
#include "run/datetime.hpp"
#include "run/messages.hpp"
#include "run/run_state.hpp"
#include "solver2d/model_state.hpp"

GenerationState gGeneration;

namespace {

constexpr int32_t kHotStartItems = 18;

double SecondsBetween(const DateTime& from, const DateTime& to) {
    return (static_cast<double>(to.day) - from.day) * 86400.0 + (to.seconds - from.seconds);
}

// The records' value series: column 1 is the main value, column 2 the deep
// water value; cubic interpolation, and no warm-up ramp.
void StoreSeries(InternalGenRecord& r) {
    const bool deep = gEquation.deepWaterTerms;
    if (deep && r.itemCount < 2)
        StopRun("SetupInternalGeneration: the deep water terms need two items in the series");
    const int32_t count = std::max(r.itemCount, 1);
    const int32_t methods[2] = {2, 2};
    std::vector<float> table;
    ReadTimeSeries0D(r.fileName, count, r.itemNumbers, methods, table);
    const int32_t rows = gGrid.timeStepCount + 1;
    std::vector<float> column(static_cast<size_t>(rows));
    for (int32_t n = 0; n < rows; ++n) column[n] = table[static_cast<size_t>(n) * count];
    TsAddSeries(r.seriesId, column.data());
    if (deep) {
        for (int32_t n = 0; n < rows; ++n) column[n] = table[static_cast<size_t>(n) * count + 1];
        TsAddSeries(r.deepSeriesId, column.data());
    }
}

// One record of the file into the buffers; item 2 only with the deep-water terms.
void ReadLineRecord(InternalLineFile& l, std::vector<float>& main, std::vector<float>& deep) {
    XolReadDynamic(l.file, main.data());
    if (gEquation.deepWaterTerms)
        XolReadDynamic(l.file, deep.data());
    else
        XolSkipDynamic(l.file);
}

void OpenInternalLineFile(const InternalGenRecord& r, InternalLineFile& l) {
    l.file = XolOpenRead(r.fileName);
    XolPrintSummary(l.file);
    XolFile& f = l.file;
    if (f.dimension != 1) XolStopOnContent("XOL data is not 1D", f, XolAxesFound(f));
    if (f.noDynamicItems != 2)
        XolStopOnContent("XOL data does not contain the correct number of items", f,
                         XolItemsFound(f, "2"));
    if (f.axes[0].count != r.pointCount + 1)
        XolStopOnContent("XOL data does not have the correct number of grid points (x.dir.)", f,
                         std::to_string(f.axes[0].count) + " points where the line has " +
                             std::to_string(r.pointCount + 1));

    // Times in seconds from the simulation start; a file on a relative axis
    // counts from the simulation start itself.
    const GridState& g = gGrid;
    double fileStart = 0.0;
    DateTime date;
    if (f.timeAxisType == kXolTimeCalendar && ParseDateTime(f.startDateTime, date))
        fileStart = SecondsBetween(g.start, date);
    if (f.startOffset != static_cast<double>(kDeleteValue)) fileStart += f.startOffset;
    l.fileStep = f.timeStep;
    // The last half step of the run asks for the end of step Time_step_count,
    // so the file must reach that far; a file that stops short is refused
    // here rather than running out in the middle of the run. A file may end
    // exactly there: the tolerance takes up the rounding of the two sums of
    // steps (33 steps of 0.1 s pass 11 steps of 0.3 s by 4e-16 s).
    const int32_t records = std::max(f.noTimeSteps, 0);
    const double fileEnd = fileStart + (records - 1) * l.fileStep;
    const double runEnd = g.timeStepCount * g.dt;
    const double eps = 1e-6 * std::max(g.dt, 1e-3);
    if (records < 1 || fileStart > eps || fileEnd < runEnd - eps ||
        (records > 1 && l.fileStep <= 0.0))
        StopRun("XOL data does not cover the simulation period");
    l.records = records;
    // The records the run will read, checked whole now: the first two from
    // the whole file steps before the start, to the one that reaches the end
    // of the run (and one more, which the rounding of the last time may ask for).
    const int32_t before =
        l.fileStep > 0.0 ? std::max(static_cast<int32_t>(std::floor(-fileStart / l.fileStep)), 0)
                         : 0;
    const double reach = l.fileStep > 0.0 ? std::ceil((runEnd - fileStart) / l.fileStep + 1e-6) : 0;
    const int32_t last =
        static_cast<int32_t>(std::clamp<double>(reach, before + 1.0, records - 1.0));
    XolCheckFiniteSteps(r.fileName, gEquation.deepWaterTerms ? 2 : 1, before, last);

    const size_t points = static_cast<size_t>(r.pointCount) + 1;
    try {
        l.older.assign(points, 0.0f);
        l.newer.assign(points, 0.0f);
        if (gEquation.deepWaterTerms) {
            l.deepOlder.assign(points, 0.0f);
            l.deepNewer.assign(points, 0.0f);
        }
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    // The whole file steps before the start are passed over; the last of
    // them is the older record, the next the newer one. A file that starts
    // within the tolerance after the start passes nothing over.
    for (int32_t m = 0; m < before; ++m) {
        XolSkipDynamic(f);
        XolSkipDynamic(f);
    }
    ReadLineRecord(l, l.older, l.deepOlder);
    if (before + 1 < records) {
        ReadLineRecord(l, l.newer, l.deepNewer);
    } else {
        l.newer = l.older;
        l.deepNewer = l.deepOlder;
    }
    l.olderTime = fileStart + before * l.fileStep;
    l.read = std::min(before + 2, records);
}

// Moves the file's window forward when t (seconds from the start) has passed
// the newer record, one record per call, and interpolates both items at t
// into the line buffers. The window stays at the file's end if t overshoots
// it by rounding.
void AdvanceInternalLineFile(InternalLineFile& l, int32_t points, double t) {
    GenerationState& s = gGeneration;
    const bool deep = gEquation.deepWaterTerms;
    if (t > l.olderTime + l.fileStep && l.read < l.records) {
        std::swap(l.older, l.newer);
        std::swap(l.deepOlder, l.deepNewer);
        l.olderTime += l.fileStep;
        ReadLineRecord(l, l.newer, l.deepNewer);
        ++l.read;
    }
    const double w = l.fileStep > 0.0 ? (t - l.olderTime) / l.fileStep : 0.0;
    for (int32_t p = 0; p < points; ++p) {
        s.lineValues[p] = static_cast<float>(l.older[p] * (1.0 - w) + l.newer[p] * w);
        s.deepValues[p] =
            deep ? static_cast<float>(l.deepOlder[p] * (1.0 - w) + l.deepNewer[p] * w) : 0.0f;
    }
}

void ReadRecord(KvtHandle parent, int32_t number, InternalGenRecord& r) {
    const KvtHandle section = KvtOpenSection(parent, Filled("INTERNAL_GEN_DATA_%", number));
    int32_t first[2] = {0, 0}, last[2] = {0, 0};
    KvtGetIntegerList(section, "First_Line_Pos", first, 2);
    KvtGetIntegerList(section, "Last_Line_Pos ", last, 2);
    KvtGetInteger(section, "Wave_Type", r.waveType);
    const DataFileRef ref = ReadDataFile(section, 2);
    const bool twoD = gBasic.numberOfDimensions == 2;
    if (!twoD) {
        // The mesh solver takes the one point of the first end.
        last[0] = last[1] = 0;
        r.fileName = ref.fileName;
        r.itemCount = ref.itemCount;
        r.itemNumbers[0] = ref.itemNumbers[0];
        r.itemNumbers[1] = ref.itemNumbers[1];
        r.pointCount = 0;
        r.pointJ = {first[0]};
        r.pointK = {first[1]};
        return;
    }
    // A check the reader adds: the points of the line index the grid's
    // fields, so a line that leaves the grid can't be generated on.
    const GridState& grid = gGrid;
    for (const int32_t* end : {first, last})
        if (end[0] < 0 || end[0] > grid.J || end[1] < 0 || end[1] > grid.K)
            StopRun(Filled(Filled(Filled("SetupInternalGeneration: generation line % has a point "
                                         "outside the grid (0..%,0..%)",
                                         number),
                                  grid.J),
                           grid.K));
    r.pointCount = std::max(std::abs(first[0] - last[0]), std::abs(first[1] - last[1]));
    const int32_t np = r.pointCount;
    const float m = static_cast<float>(std::max(np, 1));
    const float dj = static_cast<float>(last[0] - first[0]) / m;
    const float dk = static_cast<float>(last[1] - first[1]) / m;
    r.pointJ.resize(static_cast<size_t>(np) + 1);
    r.pointK.resize(static_cast<size_t>(np) + 1);
    for (int32_t s = 0; s <= np; ++s) {
        const float fs = static_cast<float>(s);
        r.pointJ[s] = static_cast<int32_t>(dj * fs + static_cast<float>(first[0]) + 0.5f);
        r.pointK[s] = static_cast<int32_t>(dk * fs + static_cast<float>(first[1]) + 0.5f);
    }
    // The series and the line file are read with the record's own names and
    // items, which the 2DH model does not keep beyond them.
    r.fileName = ref.fileName;
    r.itemCount = ref.itemCount;
    r.itemNumbers[0] = ref.itemNumbers[0];
    r.itemNumbers[1] = ref.itemNumbers[1];
    if (r.waveType == 0) {
        StoreSeries(r);
    } else {
        OpenInternalLineFile(r, gGeneration.lineFiles[number - 1]);
    }
}

void LogAssignment(int32_t s, int32_t j, int32_t k, int32_t number, const char* jLabel,
                   const char* kLabel, const char* mapLabel) {
    if (gRun.debugLevel != 4) return;
    WriteLine(std::string("np=") + FormatNumber(s, 6) + " " + jLabel + FormatNumber(j, 6) + " " +
              kLabel + FormatNumber(k, 6) + " " + mapLabel + FormatNumber(number, 8));
}

// Gives every point of every line its numbers; the later line's number
// stands where two lines meet. Returns the count of numbers given out.
int32_t NumberSources() {
    GenerationState& s = gGeneration;
    const GridState& g = gGrid;
    int32_t n = 0;
    for (const InternalGenRecord& r : s.records) {
        const int32_t np = r.pointCount;
        const int32_t kind = LineKind(r);
        const bool single = r.pointJ[0] == r.pointJ[np] && r.pointK[0] == r.pointK[np];
        for (int32_t p = 0; p <= np; ++p) {
            const int32_t j = r.pointJ[p], k = r.pointK[p];
            int32_t given = 1;
            s.sourceIndex[g.At(j, k)] = n + 1;
            LogAssignment(p, j, k, n + 1, "j=", "k=", "cigl(j,k)=");
            if (single) {
                s.sourceIndex[g.At(j + 1, k)] = n + 2;
                LogAssignment(p, j + 1, k, n + 2, "j+1=", "k=", "cigl(j+1,k)=");
                s.sourceIndex[g.At(j, k + 1)] = n + 3;
                LogAssignment(p, j, k + 1, n + 3, "j=", "k+1=", "cigl(j,k+1)=");
                given = 3;
            } else if (kind == 1) {
                s.sourceIndex[g.At(j + 1, k)] = n + 2;
                LogAssignment(p, j + 1, k, n + 2, "j+1=", "k=", "cigl(j+1,k)=");
                given = 2;
            } else if (kind == 2) {
                s.sourceIndex[g.At(j, k + 1)] = n + 2;
                LogAssignment(p, j, k + 1, n + 2, "j=", "k+1=", "cigl(j,k+1)=");
                given = 2;
            }
            n += given;
        }
    }
    return n;
}

// The sources of the earlier run: items 15 to 18 of its state file, with
// the same numbering since the records are the same.
void ReadHotStartSources() {
    GenerationState& s = gGeneration;
    std::vector<float> work;
    try {
        work.assign(std::max(gGrid.Points(), static_cast<size_t>(s.sourceCount)), 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    XolFile f = XolOpenRead(gBathymetry.fileName);
    std::vector<float>* targets[4] = {&s.sourceP, &s.sourceQ, &s.sourcePPrev, &s.sourceQPrev};
    for (int32_t item = 1; item <= kHotStartItems; ++item) {
        XolReadDynamic(f, work.data());
        if (item < 15) continue;
        XolCheckFinite(f, work.data());
        std::vector<float>& v = *targets[item - 15];
        std::copy(work.begin(), work.begin() + s.sourceCount, v.begin() + 1);
    }
    XolClose(f);
}

}  // namespace

int32_t LineKind(const InternalGenRecord& r) {
    const int32_t np = r.pointCount;
    if (r.pointJ[0] == r.pointJ[np]) return 1;
    if (r.pointK[0] == r.pointK[np]) return 2;
    return 3;
}

void SetupInternalGeneration(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Internal_Generation");
    GenerationState& s = gGeneration;
    s = GenerationState{};
    KvtGetInteger(section, "Number_Of_Records", s.numberOfRecords);
    if (s.numberOfRecords <= 0) return;
    // Record by record as their sections are found: a count beyond the
    // sections stops at the first one missing, before room for it is taken.
    for (int32_t i = 1; i <= s.numberOfRecords; ++i) {
        s.lineFiles.emplace_back();  // a record's line file opens as it is read
        ReadRecord(section, i, s.records.emplace_back());
    }
    if (gBasic.numberOfDimensions != 2) return;

    const GridState& g = gGrid;
    try {
        s.sourceIndex.assign(g.Points(), 0);
        s.sourceCount = NumberSources();
        const size_t length = static_cast<size_t>(s.sourceCount) + 1;
        for (std::vector<float>* v : {&s.sourceP, &s.sourcePPrev, &s.sourcePPrev2, &s.sourceQ,
                                      &s.sourceQPrev, &s.sourceQPrev2})
            v->assign(length, 0.0f);
        if (gEquation.deepWaterTerms) {
            s.sourceXiX.assign(length, 0.0f);
            s.sourceXiY.assign(length, 0.0f);
        }
        const size_t line = static_cast<size_t>(std::max(g.J, g.K)) + 1;
        s.lineValues.assign(line, 0.0f);
        s.deepValues.assign(line, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    if (gBathymetry.hotStart) ReadHotStartSources();
    s.genJ1 = 0;
    s.genJ2 = g.J;
    s.genK1 = 0;
    s.genK2 = g.K;
}

void UpdateInternalGeneration(int32_t step, int32_t axis) {
    GenerationState& s = gGeneration;
    const GridState& g = gGrid;
    const bool deep = gEquation.deepWaterTerms;
    std::vector<float>& now = axis == 1 ? s.sourceP : s.sourceQ;
    std::vector<float>& prev = axis == 1 ? s.sourcePPrev : s.sourceQPrev;
    std::vector<float>& prev2 = axis == 1 ? s.sourcePPrev2 : s.sourceQPrev2;
    // prev2 := prev, prev := now, now := 0, without copying.
    prev2.swap(prev);
    prev.swap(now);
    std::fill(now.begin(), now.end(), 0.0f);
    if (deep) {
        std::fill(s.sourceXiX.begin(), s.sourceXiX.end(), 0.0f);
        std::fill(s.sourceXiY.begin(), s.sourceXiY.end(), 0.0f);
    }
    // The x half takes the middle of the step, the y half its end.
    const float time = axis == 1 ? static_cast<float>(step) - 0.5f : static_cast<float>(step);
    for (int32_t r = 0; r < s.numberOfRecords; ++r) {
        InternalGenRecord& rec = s.records[r];
        const int32_t points = rec.pointCount + 1;
        if (rec.waveType == 0) {
            if (axis == 1) {
                const float L = TsValue(rec.seriesId);
                rec.lineHalf = (rec.lineHalf + L) * 0.5f;
                rec.lineNew = L;
                if (deep) {
                    const float D = TsValue(rec.deepSeriesId);
                    rec.deepHalf = (rec.deepHalf + D) * 0.5f;
                    rec.deepNew = D;
                }
            } else {
                rec.lineHalf = rec.lineNew;
                rec.deepHalf = rec.deepNew;
            }
            std::fill(s.lineValues.begin(), s.lineValues.begin() + points, rec.lineHalf);
            std::fill(s.deepValues.begin(), s.deepValues.begin() + points,
                      deep ? rec.deepHalf : 0.0f);
        } else {
            AdvanceInternalLineFile(s.lineFiles[r], points, static_cast<double>(time) * g.dt);
        }
        const int32_t kind = LineKind(rec);
        for (int32_t p = 0; p < points; ++p) {
            const int32_t j = rec.pointJ[p], k = rec.pointK[p];
            const int32_t i = s.sourceIndex[g.At(j, k)];
            if (kind == 1) {
                const int32_t i2 = s.sourceIndex[g.At(j + 1, k)];
                if (axis == 1) s.sourceP[i] = s.sourceP[i2] = s.lineValues[p];
                if (deep) s.sourceXiX[i] = s.sourceXiX[i2] = s.deepValues[p];
            } else if (kind == 2) {
                const int32_t i2 = s.sourceIndex[g.At(j, k + 1)];
                if (axis == 2) s.sourceQ[i] = s.sourceQ[i2] = s.lineValues[p];
                if (deep) s.sourceXiY[i] = s.sourceXiY[i2] = s.deepValues[p];
            }
        }
    }
}
