#include "output/disturbance.hpp"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <new>
#include <string>

#include "output/output_lock.hpp"
#include "run/datetime.hpp"
#include "run/messages.hpp"
#include "run/units.hpp"
#include "solver2d/model_state.hpp"

DisturbanceState gDisturbance;

const OutputItemInfo kDisturbanceItemInfo[kDisturbanceItemCount] = {
    {"Hm0", 100097, 1000, "sea_surface_wave_significant_height"},
    {"Hm0/Hm0_incoming", 100106, 99000},
    {"Time of first wave", 100107, 1400}};

namespace {

constexpr const char* kWrongItem = "rmsWriteToFile: Wrong type of item";
constexpr float kSmallestHeight = 1.0e-4f;

template <typename T>
void Allocate(std::vector<T>& v, size_t size, T value) {
    try {
        v.assign(size, value);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
}

// Hm0 from the sums of one point, by the rule of the statistics' item 1.
float Height(int32_t n, float s1, float s2) {
    if (n < 2) return kSmallestHeight;
    const float count = static_cast<float>(n);
    const float v = (s2 - s1 * s1 / count) / (count - 1.0f);
    const float h = v > 0.0f ? 4.0f * std::sqrt(v) : 0.0f;
    return std::max(h, kSmallestHeight);
}

// A value in a fixed number of columns, asterisks when it does not fit.
std::string Column(const char* text, int width) {
    const std::string s(text);
    if (static_cast<int>(s.size()) > width) return std::string(static_cast<size_t>(width), '*');
    return std::string(static_cast<size_t>(width) - s.size(), ' ') + s;
}
std::string Fixed4(double value) {
    char text[64];
    std::snprintf(text, sizeof text, "%.4f", value);
    return Column(text, 8);
}
std::string Whole(int32_t value, int width) {
    return Column(std::to_string(value).c_str(), width);
}

// The height of every point with a value into work, the delete value elsewhere.
void FillHeights(int32_t step) {
    DisturbanceState& s = gDisturbance;
    std::fill(s.work.begin(), s.work.end(), kDeleteValue);
    for (size_t p = 0; p < s.work.size(); ++p)
        if (s.samples[p] > 0 && s.samples[p] == step - s.firstStep[p] + 1)
            s.work[p] = Height(s.samples[p], s.sumEta[p], s.sumEta2[p]);
}

// Heights in work to ratios. With Scaling_Type other than 1 H is first taken
// at Grid_Point, if that point has a height now; while H is not known the
// map holds the delete value only.
void DivideByIncoming(int32_t step) {
    const DisturbanceSettings& d = gDisturbanceOutput;
    DisturbanceState& s = gDisturbance;
    if (d.scalingType != 1) {
        const float here = s.work[gGrid.At(d.gridPoint[0], d.gridPoint[1])];
        if (here > 0.0f) s.height = here;
    }
    if (!(s.height > 0.0f)) {
        if (!s.warnedNoHeight)
            ReportWarning(
                Filled("WriteOutputDisturbance: no incoming wave height at step %; the "
                       "ratio is written as delete values until there is one",
                       step));
        s.warnedNoHeight = true;
        std::fill(s.work.begin(), s.work.end(), kDeleteValue);
        return;
    }
    for (float& v : s.work)
        if (v > 0.0f) v /= s.height;
}

void WriteAreaReport(int32_t step) {
    DisturbanceState& s = gDisturbance;
    const GridState& g = gGrid;
    std::fill(s.areaSum.begin(), s.areaSum.end(), 0.0);
    std::fill(s.areaSum2.begin(), s.areaSum2.end(), 0.0);
    std::fill(s.areaMax.begin(), s.areaMax.end(), 0.0);
    std::fill(s.areaMin.begin(), s.areaMin.end(), 10.0);
    for (size_t p = 0; p < s.areaCode.size(); ++p) {
        const int32_t c = s.areaCode[p];
        if (c <= 0 || !(g.bed[p] < 0.0f)) continue;
        const double v = s.work[p] == kDeleteValue ? 0.0 : s.work[p];
        s.areaSum[c] += v;
        s.areaSum2[c] += v * v;
        s.areaMax[c] = std::max(s.areaMax[c], v);
        s.areaMin[c] = std::min(s.areaMin[c], v);
    }
    FILE* f = UnitFile(s.reportUnit);
    if (f == nullptr) return;
    const std::string rule(71, '-');
    const std::string when = DateTimeText(AddSeconds(g.start, step * g.dt));
    std::fprintf(f, "%s\n%s%s  %s\n%s\n", rule.c_str(),
                 Column("Wave disturbance coefficient at time step: ", 44).c_str(),
                 Whole(step, 7).c_str(), when.c_str(), rule.c_str());
    for (size_t c = 1; c < s.areaPoints.size(); ++c) {
        const int32_t n = s.areaPoints[c];
        if (n <= 0) continue;
        const double mean = s.areaSum[c] / n;
        const double deviation =
            n > 1
                ? std::sqrt(std::fabs((s.areaSum2[c] - s.areaSum[c] * s.areaSum[c] / n) / (n - 1)))
                : 0.0;
        std::fprintf(f, "%s%s\n", Column(" Area code: ", 16).c_str(),
                     Whole(static_cast<int32_t>(c), 6).c_str());
        const std::pair<const char*, double> rows[] = {{"Maximum value      :", s.areaMax[c]},
                                                       {"Mean value         :", mean},
                                                       {"Minimum value      :", s.areaMin[c]},
                                                       {"Standard deviation :", deviation}};
        for (const auto& [label, value] : rows)
            std::fprintf(f, "%s%s\n", Column(label, 22).c_str(), Fixed4(value).c_str());
        std::fprintf(f, "%s%s\n\n", Column("Number of data     :", 22).c_str(),
                     Whole(n, 8).c_str());
    }
    std::fflush(f);
}

}  // namespace

void SetupDisturbanceAreas() {
    const DisturbanceSettings& d = gDisturbanceOutput;
    DisturbanceState& s = gDisturbance;
    const GridState& g = gGrid;
    s.areaCode.clear(), s.areaPoints.clear();

    // The report, in a folder made for it if need be.
    std::error_code error;
    const std::filesystem::path folder = std::filesystem::path(d.areaFileName).parent_path();
    if (!folder.empty()) std::filesystem::create_directories(folder, error);
    LockOutputFile("SetupDisturbanceAreas", d.areaFileName);
    s.reportUnit = GetFreeUnit();
    if (s.reportUnit <= 0 || !OpenUnit(s.reportUnit, d.areaFileName, "w")) {
        const int error = errno;
        s.reportUnit = 0;
        StopRun("Unable to create file " + d.areaFileName + ": " + std::strerror(error));
    }

    // The code map: values cut to whole numbers, 0 or less outside every area.
    std::vector<float> values;
    Allocate(values, g.Points(), 0.0f);
    ReadGridFile2D(d.codeMapFile, d.codeMapItem, values.data(), GridShape{g.dx, g.dy, g.J, g.K});
    Allocate(s.areaCode, g.Points(), 0);
    int32_t largest = 0;
    for (size_t p = 0; p < values.size(); ++p) {
        const float v = std::clamp(values[p], 0.0f, static_cast<float>(INT32_MAX / 2));
        s.areaCode[p] = static_cast<int32_t>(v);
        largest = std::max(largest, s.areaCode[p]);
    }
    const size_t codes = static_cast<size_t>(largest) + 1;
    Allocate(s.areaPoints, codes, 0);
    Allocate(s.areaSum, codes, 0.0), Allocate(s.areaSum2, codes, 0.0);
    Allocate(s.areaMax, codes, 0.0), Allocate(s.areaMin, codes, 0.0);
    for (size_t p = 0; p < values.size(); ++p)
        if (s.areaCode[p] > 0 && g.bed[p] < 0.0f) s.areaPoints[s.areaCode[p]] += 1;
}

void InitOutputDisturbance() {
    const DisturbanceSettings& d = gDisturbanceOutput;
    DisturbanceState& s = gDisturbance;
    const size_t points = gGrid.Points();
    Allocate(s.samples, points, 0);
    Allocate(s.firstStep, points, d.type == 1 ? -1 : d.firstStep + 1);
    Allocate(s.risen, points, 0);
    Allocate(s.sumEta, points, 0.0f);
    Allocate(s.sumEta2, points, 0.0f);
    Allocate(s.work, points, kDeleteValue);
    s.height = d.scalingType == 1 ? d.incomingHeight : 0.0f;
    s.warnedNoHeight = false;
}

void CreateOutputDisturbance() {
    const DisturbanceSettings& d = gDisturbanceOutput;
    DisturbanceState& s = gDisturbance;
    const GridState& g = gGrid;
    s.file = XolCreateHeader(d.title, d.numberOfItems, 2);
    XolSetAxis(s.file, 1, g.dx, 0.0f, g.J + 1, 1000);
    XolSetAxis(s.file, 2, g.dy, 0.0f, g.K + 1, 1000);
    int32_t n = 1;
    for (int32_t item : d.itemNumbers) {
        if (item < 1 || item > kDisturbanceItemCount) StopRun(kWrongItem);
        const OutputItemInfo& info = kDisturbanceItemInfo[item - 1];
        XolSetItem(s.file, n, info.type, info.name, info.unit);
        if (info.standardName != nullptr)
            XolSetItemAttribute(s.file, n, {"standard_name", info.standardName, {}});
        ++n;
    }
    SetStepTimeAxis(s.file, d.firstStep + d.stepInterval, d.stepInterval);
    XolSetMisc(s.file, 4, g.landValue);
    SetGridProjection(s.file, 0.0, 0.0);
    LockOutputFile("CreateOutputDisturbance", d.fileName);
    int status = 0;
    XolCreateFile(s.file, d.fileName, &status);
    if (status != 0) {
        // The data layer's text ends with the file and its reason.
        const std::string& text = s.file.lastErrorText;
        const size_t named = text.find(d.fileName + ": ");
        StopRun("Unable to open " + d.fileName +
                (named == std::string::npos ? "" : text.substr(named + d.fileName.size())));
    }
    XolWriteStatic(s.file, g.bed.data(), 100079, "Bathymetry", 1000);
}

void UpdateOutputDisturbance(int32_t step) {
    const DisturbanceSettings& d = gDisturbanceOutput;
    DisturbanceState& s = gDisturbance;
    const GridState& g = gGrid;
    if (step <= d.firstStep || step > d.lastStep) return;
    const size_t stride = g.Stride();
    const float* xi = g.xi.data();
    const float* xiPrev2 = g.xiPrev2.data();
    const float* bed = g.bed.data();
    int32_t* samples = s.samples.data();
    int32_t* firstStep = s.firstStep.data();
    int32_t* risen = s.risen.data();
    float* sumEta = s.sumEta.data();
    float* sumEta2 = s.sumEta2.data();

    if (d.type == 1) {
        // A crest passes when the surface turns from rising to falling, a
        // trough the other way; the point starts after firstWave of each.
        const float H = s.height, epsHigh = d.epsHigh, epsLow = d.epsLow;
        const int32_t started = -2 * d.firstWave - 1;
#pragma omp parallel for schedule(static)
        for (int32_t k = 0; k <= g.K; ++k) {
            for (size_t p = k * stride; p < (k + 1) * stride; ++p) {
                if (firstStep[p] >= 0) continue;
                const float change = xi[p] - xiPrev2[p];
                bool rising, falling;
                if (H > 0.0f) {
                    const float r = change / H;
                    rising = r > epsHigh, falling = r < epsLow;
                } else {  // the sign of the change
                    rising = change > 0.0f, falling = change < 0.0f;
                }
                if (rising && risen[p] == 0) {
                    risen[p] = 1;
                    firstStep[p] -= 1;
                } else if (falling && risen[p] == 1) {
                    risen[p] = 0;
                    firstStep[p] -= 1;
                }
                if (firstStep[p] == started) firstStep[p] = step;
            }
        }
    }
    if (d.type == 3 && (step - d.firstStep) % d.stepInterval == 1) {
        std::fill(s.samples.begin(), s.samples.end(), 0);
        std::fill(s.sumEta.begin(), s.sumEta.end(), 0.0f);
        std::fill(s.sumEta2.begin(), s.sumEta2.end(), 0.0f);
        std::fill(s.firstStep.begin(), s.firstStep.end(), step);
    }
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k) {
        for (size_t p = k * stride; p < (k + 1) * stride; ++p) {
            if (firstStep[p] < 0 || !(xi[p] - bed[p] > 0.0f)) continue;
            samples[p] += 1;
            sumEta[p] += xi[p];
            sumEta2[p] += xi[p] * xi[p];
        }
    }
}

void WriteOutputDisturbance(int32_t step) {
    const DisturbanceSettings& d = gDisturbanceOutput;
    DisturbanceState& s = gDisturbance;
    if (step < d.firstStep + d.stepInterval || step > d.lastStep ||
        (step - d.firstStep) % d.stepInterval != 0)
        return;
    for (int32_t item : d.itemNumbers) {
        switch (item) {
            case 1:
                FillHeights(step);
                break;
            case 2:
                FillHeights(step);
                DivideByIncoming(step);
                if (d.areaStatistic > 0) WriteAreaReport(step);
                break;
            case 3: {
                std::fill(s.work.begin(), s.work.end(), kDeleteValue);
                const double dt = gGrid.dt;
                for (size_t p = 0; p < s.work.size(); ++p)
                    if (s.firstStep[p] > 0) s.work[p] = static_cast<float>(s.firstStep[p] * dt);
                break;
            }
            default:
                StopRun(kWrongItem);
        }
        XolWriteDynamic(s.file, s.work.data());
    }
    XolFlush(s.file);
}

void CloseOutputDisturbance() {
    DisturbanceState& s = gDisturbance;
    if (s.file.mode == 2 && s.file.file != 0) {
        XolFlush(s.file);
        XolClose(s.file);
        UnlockOutputFile(gDisturbanceOutput.fileName);
        XolPrintSummary(s.file);
    }
    s.samples = {}, s.firstStep = {}, s.risen = {};
    s.sumEta = {}, s.sumEta2 = {}, s.work = {};
    if (s.reportUnit > 0) ReleaseUnit(s.reportUnit);
    if (s.reportUnit > 0) UnlockOutputFile(gDisturbanceOutput.areaFileName);
    s.reportUnit = 0;
}
