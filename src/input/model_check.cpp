#include "input/model_check.hpp"

#include <cmath>
#include <cstdio>

#include "data/tsfunc.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

namespace {

struct Source {
    WaveResolution line;
    int32_t seriesId = 0;
    int32_t j = 0, k = 0;  // the middle of its line
    std::vector<float> series;
};

const char* kSides[] = {"", "west", "north", "east", "south"};

std::vector<Source> SeriesSources() {
    const GridState& g = gGrid;
    std::vector<Source> sources;
    for (size_t b = 0; b < gBoundaries.records.size(); ++b) {
        const BoundaryRecord& r = gBoundaries.records[b];
        if (r.dataSpecification != 0 || r.seriesId <= 0) continue;
        Source s;
        s.line.source = "Boundary " + std::to_string(b + 1) + " (" +
                        kSides[r.orientation >= 1 && r.orientation <= 4 ? r.orientation : 0] +
                        (r.formulation == 0 ? ", level)" : ", flux)");
        // Waves from a west or east line travel along x.
        s.line.spacing = r.orientation == 1 || r.orientation == 3 ? g.dx : g.dy;
        s.seriesId = r.seriesId;
        s.j = (r.first[0] + r.last[0]) / 2, s.k = (r.first[1] + r.last[1]) / 2;
        sources.push_back(s);
    }
    for (size_t i = 0; i < gGeneration.records.size(); ++i) {
        const InternalGenRecord& r = gGeneration.records[i];
        if (r.waveType != 0 || r.seriesId <= 0 || r.pointJ.empty()) continue;
        Source s;
        s.line.source = "Generation line " + std::to_string(i + 1);
        const int32_t np = r.pointCount;
        // A line along y sends its waves along x.
        s.line.spacing = r.pointJ[0] == r.pointJ[np] ? g.dx : g.dy;
        s.seriesId = r.seriesId;
        s.j = r.pointJ[np / 2], s.k = r.pointK[np / 2];
        sources.push_back(s);
    }
    return sources;
}

}  // namespace

double MeanZeroCrossingPeriod(const std::vector<float>& series, double dt) {
    if (series.size() < 3) return 0.0;
    double mean = 0.0;
    for (float v : series) mean += v;
    mean /= static_cast<double>(series.size());
    double first = -1.0, last = -1.0;
    int crossings = 0;
    for (size_t n = 1; n < series.size(); ++n) {
        const double a = series[n - 1] - mean, b = series[n] - mean;
        if (a < 0.0 && b >= 0.0) {
            const double t = (static_cast<double>(n - 1) + a / (a - b)) * dt;
            if (crossings == 0) first = t;
            last = t;
            ++crossings;
        }
    }
    return crossings >= 2 ? (last - first) / (crossings - 1) : 0.0;
}

double ModelWaveNumber(double period, double depth, double B) {
    const double g = static_cast<double>(9.81f);
    const double omega2 = std::pow(2.0 * M_PI / period, 2.0);
    auto w2 = [&](double k) {
        const double kh2 = (k * depth) * (k * depth);
        return g * depth * k * k * (1.0 + B * kh2) / (1.0 + (B + 1.0 / 3.0) * kh2);
    };
    // w2 rises from 0 with k. Without the deep-water terms it stays below
    // 3 g / h, so a period shorter than the equations carry has no wave.
    double lo = 0.0, hi = 1.0 / depth;
    while (w2(hi) < omega2 && hi < 1e4 / depth) hi *= 2.0;
    if (w2(hi) < omega2) return 0.0;
    for (int i = 0; i < 200; ++i) {
        const double mid = 0.5 * (lo + hi);
        (w2(mid) < omega2 ? lo : hi) = mid;
    }
    return 0.5 * (lo + hi);
}

std::vector<WaveResolution> FindWaveResolution() {
    const GridState& g = gGrid;
    std::vector<Source> sources = SeriesSources();
    if (sources.empty()) return {};
    for (int32_t n = 0; n <= g.timeStepCount; ++n) {
        TsReadStep(n);
        for (Source& s : sources) s.series.push_back(TsValue(s.seriesId));
    }
    const double B =
        gEquation.deepWaterTerms ? static_cast<double>(gEquation.dispersionFactor) : 0.0;
    std::vector<WaveResolution> lines;
    for (Source& s : sources) {
        WaveResolution& w = s.line;
        w.period = MeanZeroCrossingPeriod(s.series, g.dt);
        w.depth = -static_cast<double>(g.bed[static_cast<size_t>(s.k) * g.Stride() + s.j]);
        const double k =
            w.period > 0.0 && w.depth > 0.0 ? ModelWaveNumber(w.period, w.depth, B) : 0.0;
        if (k > 0.0) w.wavelength = 2.0 * M_PI / k;
        w.stepsPerPeriod = w.period / g.dt;
        lines.push_back(w);
    }
    return lines;
}

void WriteModelCheck() {
    WriteBlockHeading("Model Check");
    for (const WaveResolution& w : FindWaveResolution()) {
        char text[256];
        if (w.period <= 0.0)
            std::snprintf(text, sizeof text, "%s: its series gives no period", w.source.c_str());
        else if (w.depth <= 0.0)
            std::snprintf(text, sizeof text, "%s: period %.3g s, dry at the middle of its line",
                          w.source.c_str(), w.period);
        else if (w.wavelength <= 0.0)
            std::snprintf(text, sizeof text,
                          "%s: period %.3g s is shorter than the equations solved carry in %.3g m "
                          "of water",
                          w.source.c_str(), w.period, w.depth);
        else
            std::snprintf(text, sizeof text,
                          "%s: period %.3g s, depth %.3g m, wavelength %.4g m: %.3g points per "
                          "wavelength (spacing %.3g m), %.3g steps per period",
                          w.source.c_str(), w.period, w.depth, w.wavelength,
                          w.wavelength / w.spacing, w.spacing, w.stepsPerPeriod);
        WriteLine(std::string("  ") + text);
        std::printf("%s\n", text);
    }
    const char* done = "The model is read and checked; no time step was computed (-check)";
    WriteLine(std::string("  ") + done);
    WriteBlockHeading("");
    std::printf("%s\n", done);
    std::fflush(stdout);
}
