#include "processes/open_boundaries.hpp"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <new>

#include "data/tsfunc.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "run/datetime.hpp"
#include "run/messages.hpp"
#include "run/run_state.hpp"
#include "solver2d/model_state.hpp"

BoundaryState gBoundaries;

namespace {

bool IsLand(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    return g.bed[g.At(j, k)] >= g.landValue;
}

[[noreturn]] void StopSkew() {
    StopRun("Boundary line is skew to the grid");
}

// The side of the water that the line closes: sorts the ends first.
int32_t BoundaryOrientation(BoundaryRecord& r) {
    for (int c = 0; c < 2; ++c)
        if (r.first[c] > r.last[c]) std::swap(r.first[c], r.last[c]);
    const GridState& g = gGrid;
    const int32_t j1 = r.first[0], k1 = r.first[1], j2 = r.last[0], k2 = r.last[1];
    if (j1 < 0 || k1 < 0 || j2 > g.J || k2 > g.K)
        StopRun(Filled(Filled("SetupOpenBoundaries: boundary % has a point outside the grid (0..%,",
                              static_cast<int32_t>(gBoundaries.records.size())),
                       g.J) +
                Filled("0..%)", g.K));
    if (j1 != j2 && k1 != k2) StopSkew();

    // Whether all of a row (k fixed, j1..j2) or a column (j fixed, k1..k2) is land.
    auto rowLand = [](int32_t k, int32_t a, int32_t b) {
        for (int32_t j = a; j <= b; ++j)
            if (!IsLand(j, k)) return false;
        return true;
    };
    auto columnLand = [](int32_t j, int32_t a, int32_t b) {
        for (int32_t k = a; k <= b; ++k)
            if (!IsLand(j, k)) return false;
        return true;
    };

    if (j1 == j2 && k1 == k2) {
        if (j1 == 0) return 1;
        if (j1 == g.J) return 3;
        if (k1 == 0) return 4;
        if (k1 == g.K) return 2;
        const bool west = IsLand(j1 - 1, k1), east = IsLand(j1 + 1, k1);
        const bool south = IsLand(j1, k1 - 1), north = IsLand(j1, k1 + 1);
        if (west + east + south + north != 3) StopSkew();
        if (!east) return 1;
        if (!west) return 3;
        if (!north) return 4;
        return 2;
    }
    if (k1 == k2) {  // along j
        if (k1 == 0) return 4;
        if (k1 == g.K) return 2;
        const bool below = rowLand(k1 - 1, j1, j2), above = rowLand(k1 + 1, j1, j2);
        if (below && !above) return 4;
        if (above && !below) return 2;
        StopSkew();
    }
    // along k
    if (j1 == 0) return 1;
    if (j1 == g.J) return 3;
    const bool west = columnLand(j1 - 1, k1, k2), east = columnLand(j1 + 1, k1, k2);
    if (west && !east) return 1;
    if (east && !west) return 3;
    StopSkew();
}

double SecondsBetween(const DateTime& from, const DateTime& to) {
    return (static_cast<double>(to.day) - from.day) * 86400.0 + (to.seconds - from.seconds);
}

// The time axis of a series or line file, in seconds from the simulation
// start, checked to be calendar and to cover the whole run.
struct FileTimes {
    double start = 0.0;  // time of the first record
    double step = 0.0;
    int32_t records = 0;
};

FileTimes CheckPeriod(const XolFile& f) {
    DateTime date;
    if (f.timeAxisType != kXolTimeCalendar || !ParseDateTime(f.startDateTime, date))
        XolStopOnContent("XOL data does not contain a calendar time axis", f,
                         f.timeAxisType == kXolTimeCalendar
                             ? "its start \"" + std::string(Trim(f.startDateTime)) + "\" is no date"
                             : "its time axis counts from no date");
    const GridState& g = gGrid;
    FileTimes t;
    t.start = SecondsBetween(g.start, date);
    if (f.startOffset != static_cast<double>(kDeleteValue)) t.start += f.startOffset;
    t.step = f.timeStep;
    t.records = std::max(f.noTimeSteps, 0);
    // A file may end exactly at the last time of the run; the tolerance
    // takes up the rounding of the two sums of steps.
    const double runEnd = g.timeStepCount * g.dt;
    const double eps = 1e-6 * std::max(g.dt, 1e-3);
    const double fileEnd = t.start + (t.records - 1) * t.step;
    if (t.records < 2 || t.start > eps || fileEnd < runEnd - eps ||
        (t.records > 1 && t.step <= 0.0)) {
        char detail[200];
        std::snprintf(detail, sizeof detail,
                      "it runs from %.6g s to %.6g s of the run in %d records, the run from 0 s "
                      "to %.6g s",
                      t.start, fileEnd, t.records, runEnd);
        XolStopOnContent("XOL data does not cover the simulation period", f, detail);
    }
    return t;
}

// The record at or before time t (seconds from the simulation start), at
// most records - 2 so that a next record exists, and the weight of the next.
int32_t RecordBefore(const FileTimes& f, double t, double& w) {
    const double eps = 1e-6;
    int32_t i = static_cast<int32_t>(std::floor((t - f.start) / f.step + eps));
    i = std::clamp(i, 0, std::max(f.records - 2, 0));
    w = (t - (f.start + i * f.step)) / f.step;
    return i;
}

void LogSeries(const char* title, const std::vector<float>& values) {
    WriteLine("");
    WriteLine(title);
    for (size_t n = 0; n < values.size(); ++n)
        WriteLine(FormatNumber(static_cast<int32_t>(n), 8) + FormatNumber(values[n], 14));
}

// Data_Specification 0: the series of the record, ramped over the warm-up period,
// into the series store.
void StoreBoundarySeries(BoundaryRecord& r) {
    const GridState& g = gGrid;
    const bool deep = gEquation.deepWaterTerms;
    const int32_t count = std::clamp(r.itemCount, 1, 2);
    if (deep && count < 2)
        StopRun("SetupOpenBoundaries: the deep water terms need two items in the series");
    const int32_t methods[2] = {2, 2};
    std::vector<float> table;
    ReadTimeSeries0D(r.fileName, count, r.itemNumbers, methods, table);

    const int32_t rows = g.timeStepCount + 1;
    std::vector<float> main(static_cast<size_t>(rows)), deepValues;
    for (int32_t n = 0; n < rows; ++n) main[n] = table[static_cast<size_t>(n) * count];
    if (deep) {
        deepValues.resize(static_cast<size_t>(rows));
        for (int32_t n = 0; n < rows; ++n)
            deepValues[n] = table[static_cast<size_t>(n) * count + 1];
    }

    // The ramp of a level boundary starts from the surface the model holds at
    // the middle of the line, so that a raised initial surface has no jump.
    const int32_t W = g.warmUpPeriod;
    if (W > 0) {
        const float ref =
            r.formulation == 0
                ? g.xi[g.At((r.first[0] + r.last[0]) / 2, (r.first[1] + r.last[1]) / 2)]
                : 0.0f;
        for (int32_t i = 1; i <= std::min(W, rows - 1); ++i) {
            const float angle = static_cast<float>((2.0 * i / W - 1.0) * 1.570796);
            const float ramp = (1.0f + std::sin(angle)) / 2.0f;
            main[i] = (main[i] - ref) * ramp + ref;
            if (deep) deepValues[i] *= ramp;
        }
    }
    if (gRun.debugLevel == 2) {
        LogSeries("Boundary values", main);
        if (deep) LogSeries("Boundary values (deep water related)", deepValues);
    }
    TsAddSeries(r.seriesId, main.data());
    if (deep) TsAddSeries(r.deepSeriesId, deepValues.data());
}

void ReadLineRecord(BoundaryLineFile& l, std::vector<float>& buffer, int32_t points) {
    for (int32_t i = 0; i < l.itemsInFile; ++i)
        XolReadDynamic(l.file, buffer.data() + static_cast<size_t>(i) * points);
}

// Data_Specification 1 (one item along the line) and 2 (hot transfer data:
// "Water depth", "P flux", "Q flux"): the file opened and its first two
// records read around the start of the run.
void OpenBoundaryLineFile(const BoundaryRecord& r, int32_t rows, BoundaryLineFile& l) {
    l.file = XolOpenRead(r.fileName);
    XolPrintSummary(l.file);
    const XolFile& f = l.file;
    if (f.dimension != 1) XolStopOnContent("XOL data is not 1D", f, XolAxesFound(f));
    const int32_t items = r.dataSpecification == 1 ? 1 : 3;
    if (f.noDynamicItems != items)
        XolStopOnContent("XOL data does not contain the correct number of items", f,
                         XolItemsFound(f, std::to_string(items)));
    if (r.dataSpecification == 2 && f.dataType != 1)
        XolStopOnContent("XOL data is not hot transfer data", f,
                         "its data-type flag is " + std::to_string(f.dataType) + ", not 1");
    const GridState& g = gGrid;
    const bool alongK = r.orientation == 1 || r.orientation == 3;
    const float spacing = alongK ? g.dy : g.dx;
    if (std::fabs(f.axes[0].spacing - spacing) > 1e-5f * spacing)
        XolStopOnContent(alongK ? "XOL data does not have the correct grid spacing (y-dir.)"
                                : "XOL data does not have the correct grid spacing (x-dir.)",
                         f, XolSpacingFound(f.axes[0].spacing, spacing));
    if (f.axes[0].count != rows)
        XolStopOnContent(
            "XOL data does not have the correct number of grid points (x.dir.)", f,
            std::to_string(f.axes[0].count) + " points where the line has " + std::to_string(rows));
    const FileTimes t = CheckPeriod(f);

    l.itemsInFile = items;
    l.fileStep = t.step;
    l.simulationOffset = -t.start;
    try {
        l.older.assign(static_cast<size_t>(items) * rows, 0.0f);
        l.newer.assign(static_cast<size_t>(items) * rows, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    double w = 0.0;
    const int32_t before = RecordBefore(t, 0.0, w);
    // The records the run will read, checked whole now: from the one before
    // the start to the one that reaches the end of the run (and one more,
    // which the rounding of the last time may ask for).
    const double runEnd = gGrid.timeStepCount * gGrid.dt;
    const double reach = std::ceil((runEnd - t.start) / t.step + 1e-6);
    const int32_t last =
        static_cast<int32_t>(std::clamp<double>(reach, before + 1.0, t.records - 1.0));
    XolCheckFiniteSteps(r.fileName, items, before, last);
    for (int64_t m = 0; m < static_cast<int64_t>(before) * items; ++m) XolSkipDynamic(l.file);
    ReadLineRecord(l, l.older, rows);
    ReadLineRecord(l, l.newer, rows);
    l.recordsRead = before + 2;
    l.olderTime = t.start + before * t.step;
    l.newerTime = l.olderTime + t.step;
}

// Moves the two records of a line file up to the time of the step and puts
// the interpolated items into columns 1, 2, ... of the boundary's table.
void AdvanceBoundaryLineFile(int32_t step, int32_t b) {
    BoundaryLineFile& l = gBoundaries.lineFiles[b - 1];
    BoundaryTable& table = BoundaryValues(b);
    const int32_t rows = table.rows;
    const double t = step * gGrid.dt;
    const double eps = 1e-6 * l.fileStep;
    while (t > l.newerTime + eps) {
        std::swap(l.older, l.newer);
        l.olderTime = l.newerTime;
        l.newerTime += l.fileStep;
        ReadLineRecord(l, l.newer, rows);
        ++l.recordsRead;
    }
    const float w = static_cast<float>((t - l.olderTime) / l.fileStep);
    for (int32_t i = 0; i < l.itemsInFile; ++i) {
        const float* older = l.older.data() + static_cast<size_t>(i) * rows;
        const float* newer = l.newer.data() + static_cast<size_t>(i) * rows;
        for (int32_t s = 0; s < rows; ++s)
            table.Value(s, i + 1) = older[s] * (1.0f - w) + newer[s] * w;
    }
}

}  // namespace

void ReadTimeSeries0D(const std::string& path, int32_t count, const int32_t* items,
                      const int32_t* methods, std::vector<float>& series) {
    XolFile f = XolOpenRead(path);
    XolPrintSummary(f);
    if (f.dimension != 0) XolStopOnContent("XOL data is not 0D", f, XolAxesFound(f));
    if (f.noDynamicItems < count)
        XolStopOnContent("XOL data does not contain the correct number of items", f,
                         XolItemsFound(f, "at least " + std::to_string(count)));
    for (int32_t e = 0; e < count; ++e)
        if (items[e] < 1 || items[e] > f.noDynamicItems)
            XolStopOnContent("XOL data does not contain the correct number of items", f,
                             "it holds " + std::to_string(f.noDynamicItems) + " items, and item " +
                                 std::to_string(items[e]) + " is asked for");
    const FileTimes t = CheckPeriod(f);

    // The records the run needs, from the one before the first at or before
    // the start to the one after the last after the end; each holds all items.
    const GridState& g = gGrid;
    const int32_t itemsInFile = f.noDynamicItems;
    double w = 0.0;
    const int32_t firstNeeded = std::max(RecordBefore(t, 0.0, w) - 1, 0);
    const int32_t lastNeeded =
        std::min(RecordBefore(t, g.timeStepCount * g.dt, w) + 2, t.records - 1);
    std::vector<float> records;
    try {
        records.assign(static_cast<size_t>(lastNeeded - firstNeeded + 1) * itemsInFile, 0.0f);
        series.assign(static_cast<size_t>(g.timeStepCount + 1) * count, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    for (int64_t m = 0; m < static_cast<int64_t>(firstNeeded) * itemsInFile; ++m) XolSkipDynamic(f);
    for (int32_t m = firstNeeded; m <= lastNeeded; ++m) {
        for (int32_t i = 0; i < itemsInFile; ++i) {
            float* value = &records[static_cast<size_t>(m - firstNeeded) * itemsInFile + i];
            XolReadDynamic(f, value);
            if (std::find(items, items + count, i + 1) != items + count) XolCheckFinite(f, value);
        }
    }
    XolClose(f);

    auto value = [&](int32_t m, int32_t item) {
        return records[static_cast<size_t>(m - firstNeeded) * itemsInFile + item - 1];
    };
    for (int32_t n = 0; n <= g.timeStepCount; ++n) {
        const int32_t i1 = RecordBefore(t, n * g.dt, w);
        const int32_t i2 = std::min(i1 + 1, t.records - 1);
        for (int32_t e = 0; e < count; ++e) {
            const double r1 = value(i1, items[e]), r2 = value(i2, items[e]);
            double v;
            if (methods[e] == 1) {
                v = r1 * (1.0 - w) + r2 * w;
            } else if (methods[e] == 3) {
                double r2d = r2;
                if (r2 - r1 < -180.0) r2d += 360.0;
                if (r2 - r1 > 180.0) r2d -= 360.0;
                v = r1 * (1.0 - w) + r2d * w;
            } else {
                // Records outside the file are extrapolated from the inner
                // ones; a file of two records gives a straight line.
                const bool has0 = i1 - 1 >= firstNeeded, has3 = i2 + 1 <= lastNeeded;
                double r0 = has0 ? value(i1 - 1, items[e]) : 0.0;
                double r3 = has3 ? value(i2 + 1, items[e]) : 0.0;
                if (!has0 && !has3) {
                    r0 = 2.0 * r1 - r2;
                    r3 = 2.0 * r2 - r1;
                } else if (!has0) {
                    r0 = 3.0 * (r1 - r2) + r3;
                } else if (!has3) {
                    r3 = 3.0 * (r2 - r1) + r0;
                }
                const double m = (r2 - r0) / 2.0;
                const double c = (r3 - r1) / 2.0 - 2.0 * r2 + m + 2.0 * r1;
                v = r1 + (m + ((r2 - m - r1 - c) + c * w) * w) * w;
            }
            series[static_cast<size_t>(n) * count + e] = static_cast<float>(v);
        }
    }
}

void SetupOpenBoundaries(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Boundary_Location");
    gBoundaries = BoundaryState{};
    int32_t number = 0;
    KvtGetInteger(section, "Number_Of_Boundaries", number);
    number = std::max(number, 0);
    if (gEquation.convectiveHandle != 0 && number > 0)
        StopRun("Only central differencing with side-feeding is allow using open boundaries");
    gBoundaries.numberOfBoundaries = number;
    const bool twoD = gBasic.numberOfDimensions == 2;

    for (int32_t b = 1; b <= number; ++b) {
        const KvtHandle data = KvtOpenSection(section, Filled("BOUNDARY_DATA_%", b));
        BoundaryRecord r;
        KvtGetIntegerList(data, "First_Point", r.first, 2);
        KvtGetIntegerList(data, "Last_Point", r.last, 2);
        KvtGetInteger(data, "Formulation", r.formulation);
        KvtGetInteger(data, "Data_Specification", r.dataSpecification);
        const DataFileRef ref = ReadDataFile(data, 4);
        r.fileName = ref.fileName;
        r.itemCount = ref.itemCount;
        std::copy(ref.itemNumbers, ref.itemNumbers + 4, r.itemNumbers);
        gBoundaries.records.push_back(r);
        if (!twoD) continue;

        BoundaryRecord& rec = gBoundaries.records.back();
        rec.orientation = BoundaryOrientation(rec);
        if (rec.formulation != 0 && rec.formulation != 1)
            StopRun("Boundary formulation is unknown");
        if (rec.dataSpecification < 0 || rec.dataSpecification > 2)
            StopRun("Boundary specification is unknown");

        BoundaryTable table;
        table.rows = rec.orientation == 1 || rec.orientation == 3 ? rec.last[1] - rec.first[1] + 1
                                                                  : rec.last[0] - rec.first[0] + 1;
        try {
            table.values.assign(static_cast<size_t>(table.rows) * 6, 0.0f);
        } catch (const std::bad_alloc&) {
            StopRun("Unable to allocate memory");
        }
        if (rec.formulation == 1)
            for (int32_t s = 0; s < table.rows; ++s) table.Value(s, 2) = 1.0f;
        gBoundaries.boundaryValues.push_back(std::move(table));
        gBoundaries.lineFiles.emplace_back();

        if (rec.dataSpecification == 0)
            StoreBoundarySeries(rec);
        else
            OpenBoundaryLineFile(rec, gBoundaries.boundaryValues.back().rows,
                                 gBoundaries.lineFiles.back());
    }
}

void UpdateBoundaryData(int32_t step) {
    const GridState& g = gGrid;
    for (int32_t b = 1; b <= gBoundaries.numberOfBoundaries; ++b) {
        const BoundaryRecord& r = Boundary(b);
        BoundaryTable& t = BoundaryValues(b);
        const bool alongK = r.orientation == 1 || r.orientation == 3;
        auto x = [&](int32_t s) {
            return alongK ? g.xi[g.At(r.first[0], r.first[1] + s)]
                          : g.xi[g.At(r.first[0] + s, r.first[1])];
        };
        if (r.dataSpecification == 0) {
            const float L = TsValue(r.seriesId);
            if (r.formulation == 0) {
                for (int32_t s = 0; s < t.rows; ++s) {
                    t.Value(s, 1) = L;
                    t.Value(s, 2) = (x(s) + L) / 2.0f;
                }
            } else {
                for (int32_t s = 0; s < t.rows; ++s) t.Value(s, 1) = t.Value(s, 2) * L;
            }
        } else {
            AdvanceBoundaryLineFile(step, b);
            if (r.dataSpecification == 1 && r.formulation == 0) {
                // A level along the line: the half-step value as from a series.
                for (int32_t s = 0; s < t.rows; ++s) t.Value(s, 2) = (x(s) + t.Value(s, 1)) / 2.0f;
            } else if (r.dataSpecification == 2 && r.formulation == 0) {
                for (int32_t s = 0; s < t.rows; ++s) {
                    t.Value(s, 4) = t.Value(s, 2);
                    t.Value(s, 2) = x(s) / 2.0f + t.Value(s, 1);
                }
            } else if (r.dataSpecification == 2) {
                for (int32_t s = 0; s < t.rows; ++s) {
                    t.Value(s, 1) = t.Value(s, 2);
                    t.Value(s, 4) = t.Value(s, 2);
                }
            }
        }
        // A line file carries no deep water series: its columns stay 0.
        if (gEquation.deepWaterTerms && r.dataSpecification <= 1 && r.deepSeriesId > 0) {
            const float D = TsValue(r.deepSeriesId);
            for (int32_t s = 0; s < t.rows; ++s) {
                if (step == 1) t.Value(s, 5) = D;
                t.Value(s, 6) = (t.Value(s, 5) + D) / 2.0f;
                t.Value(s, 5) = D;
            }
        }
    }
}
