// bwbasin: what one time step of the 2DH loop does to a wave, measured in a
// closed flat basin built in memory. A standing wave of one mode is started
// from rest and the surface projected on the mode's shape after each step;
// a least-squares fit of x[n+1] = p x[n] - q x[n-1] to the projections gives
// the pair of eigenvalues of the mode, z^2 - p z + q = 0, and from them the
// amplitude and phase error per period against the equations' own frequency,
// in the terms of the Fourier analysis beside it (scheme.py). With --noise
// the basin starts at rest under a small random surface, and the growth per
// step of the largest surface is measured instead.
//
// bwbasin [options]; one line of results (and the column names with --header).
#include <omp.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "data/tsfunc.hpp"
#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "run/process.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

namespace {

constexpr double kPi = 3.14159265358979323846;

const char* kUsage =
    "usage: bwbasin [options]\n"
    "  --depth H        still water depth, m (0.45)\n"
    "  --dx DX          grid spacing along x, m (0.05); --dy DY along y (DX)\n"
    "  --dt DT          time step, s (0.02); or --courant C: DT = C DX / sqrt(g H)\n"
    "  --fe F           Time_extrapolation_factor_lower (1; forced to 1 without --deep 1)\n"
    "  --deep 0|1       the deep-water terms, dispersion factor 1/15 (1)\n"
    "  --filter C       Grid_scale_filter (0)\n"
    "  --family 0|1     0 central sweeps, 1 upwind sweeps (Convective_terms_handle) (0)\n"
    "  --mode MX,MY     standing wave cos(MX pi x/Lx) cos(MY pi y/Ly) (1,1)\n"
    "  --cells NX,NY    water points along x and y; the basin is NX DX by NY DY (40,40)\n"
    "  --ppw P          points per wavelength: cells and mode numbers are derived for\n"
    "                   the direction of --mode (MY 0 along x, MX 0 along y, else the\n"
    "                   diagonal) in a basin of 40 to 80 points\n"
    "  --kh KH          with --ppw: DX = DY = 2 pi H / (KH P)\n"
    "  --periods N      run length in periods of the mode (20); of the shortest\n"
    "                   diagonal wave (pi, pi) with --noise\n"
    "  --steps N        run length in steps (overrides --periods)\n"
    "  --amplitude A    amplitude of the standing wave, m (1e-4)\n"
    "  --noise A        the basin at rest under a uniform random surface in [-A, A]\n"
    "  --seed S         seed of the noise (1)\n"
    "  --skip N         steps left out at the start of the fit (a period, at least 20)\n"
    "  --series FILE    write n, the projection on the mode, the largest surface and\n"
    "                   the largest departure from the mode of every step to FILE\n"
    "  --header         print the column names first\n";

struct Options {
    double h = 0.45, dx = 0.05, dy = 0.0, dt = 0.02, fe = 1.0, courant = 0.0, filter = 0.0;
    bool deep = true;
    int family = 0;
    int mx = 1, my = 1;
    int nx = 40, ny = 40;
    bool cellsGiven = false;
    double ppw = 0.0, kh = 0.0;
    double periods = 20.0;
    int steps = 0;
    int skip = -1;
    double amplitude = 1e-4, noise = 0.0;
    unsigned seed = 1;
    bool header = false;
    std::string series;
};

[[noreturn]] void Fail(const std::string& text) {
    std::fprintf(stderr, "bwbasin: %s\n%s", text.c_str(), kUsage);
    std::exit(2);
}

bool ParsePair(const char* s, int& a, int& b) {
    return std::sscanf(s, "%d,%d", &a, &b) == 2;
}

Options Parse(int argc, char** argv) {
    Options o;
    for (int i = 1; i < argc; ++i) {
        const std::string a = argv[i];
        if (a == "--header") {
            o.header = true;
            continue;
        }
        if (a == "--help" || a == "-h") {
            std::fputs(kUsage, stdout);
            std::exit(0);
        }
        if (i + 1 >= argc) Fail("missing value after " + a);
        const char* v = argv[++i];
        char* end = nullptr;
        const double x = std::strtod(v, &end);
        const bool number = end != v && *end == '\0';
        if (a == "--mode") {
            if (!ParsePair(v, o.mx, o.my) || o.mx < 0 || o.my < 0)
                Fail("bad --mode " + std::string(v));
            continue;
        }
        if (a == "--cells") {
            if (!ParsePair(v, o.nx, o.ny) || o.nx < 2 || o.ny < 2)
                Fail("bad --cells " + std::string(v));
            o.cellsGiven = true;
            continue;
        }
        if (a == "--series") {
            o.series = v;
            continue;
        }
        if (!number) Fail("bad value of " + a + ": " + v);
        if (a == "--depth")
            o.h = x;
        else if (a == "--dx")
            o.dx = x;
        else if (a == "--dy")
            o.dy = x;
        else if (a == "--dt")
            o.dt = x;
        else if (a == "--courant")
            o.courant = x;
        else if (a == "--fe")
            o.fe = x;
        else if (a == "--deep")
            o.deep = x != 0.0;
        else if (a == "--filter")
            o.filter = x;
        else if (a == "--family")
            o.family = static_cast<int>(x);
        else if (a == "--ppw")
            o.ppw = x;
        else if (a == "--kh")
            o.kh = x;
        else if (a == "--periods")
            o.periods = x;
        else if (a == "--steps")
            o.steps = static_cast<int>(x);
        else if (a == "--skip")
            o.skip = static_cast<int>(x);
        else if (a == "--amplitude")
            o.amplitude = x;
        else if (a == "--noise")
            o.noise = x;
        else if (a == "--seed")
            o.seed = static_cast<unsigned>(x);
        else
            Fail("unknown option " + a);
    }
    if (o.h <= 0.0 || o.dt <= 0.0 || o.dx <= 0.0) Fail("depth, dx and dt must be positive");
    if (o.family != 0 && o.family != 1) Fail("--family is 0 or 1");
    if (o.kh > 0.0 && o.ppw <= 0.0) Fail("--kh wants --ppw");
    if (o.ppw > 0.0) {
        if (o.noise > 0.0 || (o.mx == 0 && o.my == 0)) Fail("--ppw wants a wave mode");
        if (o.mx > 0 && o.my > 0 && o.mx != o.my)
            Fail("--ppw wants a mode along x, y or the diagonal");
        // Along an axis a wavelength spans 2 N / m points; on the diagonal sqrt(2) N / m.
        const double span = o.mx > 0 && o.my > 0 ? std::sqrt(2.0) : 2.0;
        const int m = std::max(1, static_cast<int>(std::ceil(40.0 * span / o.ppw)));
        const int n = std::max(2, static_cast<int>(std::lround(o.ppw * m / span)));
        const int across = o.cellsGiven ? (o.mx > 0 ? o.ny : o.nx) : 4;
        if (o.mx > 0 && o.my > 0)
            o.mx = o.my = m, o.nx = o.ny = n;
        else if (o.mx > 0)
            o.mx = m, o.nx = n, o.ny = across;
        else
            o.my = m, o.ny = n, o.nx = across;
        if (o.kh > 0.0) o.dx = o.dy = 2.0 * kPi * o.h / (o.kh * o.ppw);
    }
    if (o.dy <= 0.0) o.dy = o.dx;
    if (o.courant > 0.0) o.dt = o.courant * o.dx / std::sqrt(static_cast<double>(kGravity) * o.h);
    if (o.noise > 0.0) o.mx = o.my = 0;
    if (o.noise <= 0.0 && o.mx == 0 && o.my == 0) Fail("mode 0,0 wants --noise");
    return o;
}

double DispersionFactor(bool deep) {
    return deep ? static_cast<double>(1.0f / 15.0f) : 0.0;
}

// w of the wave number k in depth h by the dispersion relation of the equations.
double Omega(double k, double h, double B) {
    const double kh = k * h;
    return std::sqrt(static_cast<double>(kGravity) * h * k * k * (1.0 + B * kh * kh) /
                     (1.0 + (B + 1.0 / 3.0) * kh * kh));
}

// A flat basin of nx by ny water points in a frame of land (j = 0, J and
// k = 0, K), H deep, every process off but porosity 1.
void MakeBasin(const Options& o, int32_t steps) {
    ResetRunState();
    GridState& g = gGrid;
    g.J = o.nx + 1, g.K = o.ny + 1;
    g.dx = static_cast<float>(o.dx), g.dy = static_cast<float>(o.dy), g.dt = o.dt;
    g.timeStepCount = steps;
    g.bed.assign(g.Points(), static_cast<float>(-o.h));
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j)
            if (j == 0 || k == 0 || j == g.J || k == g.K) g.bed[g.At(j, k)] = 1.0f;
    AllocateModelState();
    gEquation.deepWaterTerms = o.deep;
    gEquation.dispersionFactor = o.deep ? 1.0f / 15.0f : 0.0f;
    gEquation.convectiveHandle = o.family;
    gEquation.extrapolationLower = o.deep ? static_cast<float>(o.fe) : 1.0f;
    gEquation.gridScaleFilter = static_cast<float>(o.filter);
    gPorosity.porosity.assign(g.Points(), 1.0f);
    gProcess.processorCount = omp_get_num_procs();
    gProcess.maxThreads = omp_get_max_threads();
    SetThreads(1);
    TsReset();
    TsInit(steps + 1);
}

bool Water(int32_t j, int32_t k) {
    return gGrid.bed[gGrid.At(j, k)] < gGrid.landValue;
}

// The shape of the mode at point (j, k): the walls stand at the faces beside the frame.
double Shape(const Options& o, int32_t j, int32_t k) {
    return std::cos(o.mx * kPi * (j - 0.5) / o.nx) * std::cos(o.my * kPi * (k - 0.5) / o.ny);
}

void SetSurface(const Options& o) {
    GridState& g = gGrid;
    std::mt19937 random(o.seed);
    std::uniform_real_distribution<double> uniform(-1.0, 1.0);
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j) {
            const size_t p = g.At(j, k);
            float v = 0.0f;
            if (Water(j, k))
                v = static_cast<float>(o.noise > 0.0 ? o.noise * uniform(random)
                                                     : o.amplitude * Shape(o, j, k));
            g.xi[p] = g.xiPrev[p] = g.xiPrev2[p] = v;
        }
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
}

// The projection of the surface on the mode, the largest surface and the
// largest departure of the surface from the mode's shape, over the water.
void Measure(const Options& o, double& projection, double& largest, double& rest) {
    const GridState& g = gGrid;
    double num = 0.0, den = 0.0;
    largest = rest = 0.0;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 1; j < g.J; ++j) {
            const double xi = g.xi[g.At(j, k)];
            largest = std::max(largest, std::fabs(xi));
            if (o.noise > 0.0) continue;
            const double s = Shape(o, j, k);
            num += s * xi, den += s * s;
        }
    projection = den > 0.0 ? num / den : 0.0;
    if (o.noise > 0.0) return;
    for (int32_t k = 1; k < g.K; ++k)
        for (int32_t j = 1; j < g.J; ++j)
            rest = std::max(rest, std::fabs(g.xi[g.At(j, k)] - projection * Shape(o, j, k)));
}

// The least-squares p, q, c of x[n+1] = p x[n] - q x[n-1] + c over n in
// [first, last): c takes up a level that does not move (a mode of eigenvalue 1).
bool FitRecurrence(const std::vector<double>& x, size_t first, size_t last, double& p, double& q) {
    double m[3][4] = {};
    for (size_t n = std::max<size_t>(first, 1); n < last && n + 1 < x.size(); ++n) {
        const double row[3] = {x[n], x[n - 1], 1.0};
        for (int r = 0; r < 3; ++r) {
            for (int c = 0; c < 3; ++c) m[r][c] += row[r] * row[c];
            m[r][3] += row[r] * x[n + 1];
        }
    }
    for (int c = 0; c < 3; ++c) {  // Gauss-Jordan with partial pivoting
        int pivot = c;
        for (int r = c + 1; r < 3; ++r)
            if (std::fabs(m[r][c]) > std::fabs(m[pivot][c])) pivot = r;
        std::swap(m[c], m[pivot]);
        if (!(std::fabs(m[c][c]) > 0.0)) return false;
        for (int r = 0; r < 3; ++r) {
            if (r == c) continue;
            const double f = m[r][c] / m[c][c];
            for (int k = c; k < 4; ++k) m[r][k] -= f * m[c][k];
        }
    }
    p = m[0][3] / m[0][0], q = -m[1][3] / m[1][1];
    return std::isfinite(p) && std::isfinite(q);
}

// The slope of log(y) against n over [first, last), by least squares.
double LogSlope(const std::vector<double>& y, size_t first, size_t last) {
    double s = 0.0, sn = 0.0, sl = 0.0, snn = 0.0, snl = 0.0;
    for (size_t n = first; n < last; ++n) {
        if (!(y[n] > 0.0)) continue;
        const double l = std::log(y[n]);
        s += 1.0, sn += n, sl += l, snn += double(n) * n, snl += n * l;
    }
    const double det = s * snn - sn * sn;
    return det > 0.0 ? (s * snl - sn * sl) / det : NAN;
}

std::string Number(double v, const char* format) {
    if (!std::isfinite(v)) return "-";
    char text[64];
    std::snprintf(text, sizeof text, format, v);
    return text;
}

}  // namespace

int main(int argc, char** argv) {
    const Options o = Parse(argc, argv);
    const double g = static_cast<double>(kGravity), B = DispersionFactor(o.deep);
    const bool noise = o.noise > 0.0;
    const double Lx = o.nx * o.dx, Ly = o.ny * o.dy;
    // The wave of the run: the mode, or with --noise the shortest diagonal wave.
    const double kx = noise ? kPi / o.dx : o.mx * kPi / Lx,
                 ky = noise ? kPi / o.dy : o.my * kPi / Ly;
    const double k = std::hypot(kx, ky), omega = Omega(k, o.h, B), period = 2.0 * kPi / omega;
    const int32_t steps =
        o.steps > 0 ? o.steps
                    : std::max(10, static_cast<int32_t>(std::ceil(o.periods * period / o.dt)));

    MakeBasin(o, steps);
    SetSurface(o);
    std::vector<double> x(1), largest(1), rest(1);
    Measure(o, x[0], largest[0], rest[0]);
    int32_t done = 0, passed = -1;
    bool stopped = false;
    PrepareTimeLoop();
    for (int32_t n = 1; n <= steps; ++n) {
        ComputeStep(n);
        gLoop.lineOrderFlag = !gLoop.lineOrderFlag;
        double pr = 0.0, mx = 0.0, other = 0.0;
        Measure(o, pr, mx, other);
        done = n;
        if (!(mx <= 0.5 * o.h)) {  // before the solver meets a dry point
            stopped = true;
            break;
        }
        x.push_back(pr), largest.push_back(mx), rest.push_back(other);
        if (passed < 0 && mx > 1e-3 * o.h) passed = n;
    }

    if (!o.series.empty()) {
        FILE* f = std::fopen(o.series.c_str(), "w");
        if (!f) Fail("cannot write " + o.series);
        for (size_t n = 0; n < x.size(); ++n)
            std::fprintf(f, "%zu %.9e %.9e %.9e\n", n, x[n], largest[n], rest[n]);
        std::fclose(f);
    }

    double lamAbs = NAN, lamPhase = NAN, ampError = NAN, phaseError = NAN, growth = NAN;
    const size_t count = x.size();  // the levels 0 .. count-1 before any stop
    size_t fitted = 0;              // steps in the fit
    if (!noise) {
        // Past the start, where the other eigenvalues of the mode still count:
        // a period and at least 20 steps (at most a quarter of the run).
        const size_t perPeriod = static_cast<size_t>(std::ceil(period / o.dt));
        const size_t first = o.skip >= 0 ? static_cast<size_t>(o.skip)
                                         : std::min(std::max<size_t>(perPeriod, 20), count / 4);
        // Up to where other modes grown from round-off (an unstable step) reach
        // 5 % of the wave, as the fit wants the mode alone, and while the wave
        // stands above the rounding: a damped one ends where none of the last
        // eight steps is above 1e-4 of the start.
        auto above = [&](size_t n) {
            for (size_t i = n >= 7 ? n - 7 : 0; i <= n; ++i)
                if (std::fabs(x[i]) > 1e-4 * std::fabs(x[0])) return true;
            return false;
        };
        size_t last = first;
        while (last + 1 < count && rest[last + 1] <= 0.05 * o.amplitude && above(last + 1)) ++last;
        fitted = last - first;
        double p = 0.0, q = 0.0;
        if (last > first + 8 && FitRecurrence(x, first, last, p, q)) {
            const double disc = q - 0.25 * p * p;
            if (disc > 0.0) {  // a complex pair: a wave
                lamAbs = std::sqrt(q);
                lamPhase = std::atan2(std::sqrt(disc), 0.5 * p);
            } else {  // two real roots: keep the larger
                const double r = 0.5 * p + (p >= 0.0 ? 1.0 : -1.0) * std::sqrt(-disc);
                lamAbs = std::fabs(r);
                lamPhase = r >= 0.0 ? 0.0 : kPi;
            }
            ampError = 1.0 - std::pow(lamAbs, period / o.dt);
            phaseError = 360.0 * (1.0 - lamPhase / o.dt / omega);
        }
    } else {
        // The last third of the run, leaving out the surfaces beyond 1 % of
        // the depth (no longer small).
        size_t last = count;
        while (last > 1 && largest[last - 1] > 0.01 * o.h) --last;
        size_t first = (2 * last) / 3;
        if (last - first < 5) first = last > 10 ? last - 10 : 0, last = count;
        growth = std::exp(LogSlope(largest, first, last));
        fitted = last - first;
    }

    const double courant = std::sqrt(g * o.h) * o.dt / o.dx;
    const double ppw = 2.0 * kPi / k / o.dx;
    // Steps done, marked s when the surface grew past half the depth.
    const std::string doneText = (stopped ? "s" : "") + std::to_string(done);
    const std::string passedText = !noise ? "-" : passed < 0 ? "none" : std::to_string(passed);
    if (o.header)
        std::printf(
            "%-7s %6s %9s %9s %10s %5s %4s %4s %4s %4s %4s %6s %6s %7s %6s %6s %6s %5s %10s %10s "
            "%10s "
            "%10s %9s %7s\n",
            "family", "depth", "dx", "dy", "dt", "fe", "deep", "mx", "my", "nx", "ny", "courant",
            "dx/h", "kh", "ppw", "steps", "done", "fit", "|lam|", "arg/step", "amp/T", "phase/T",
            "growth", "n(1e-3h)");
    std::printf(
        "%-7s %6.3f %9.6g %9.6g %10.7g %5.2f %4d %4d %4d %4d %4d %6.3f %6.3f %7.4f %6.2f %6d "
        "%6s %5zu %10s %10s %10s %10s %9s %7s\n",
        o.family == 0 ? "central" : "upwind", o.h, o.dx, o.dy, o.dt, o.deep ? o.fe : 1.0,
        o.deep ? 1 : 0, o.mx, o.my, o.nx, o.ny, courant, o.dx / o.h, k * o.h, ppw, steps,
        doneText.c_str(), fitted, Number(lamAbs, "%.8f").c_str(), Number(lamPhase, "%.6f").c_str(),
        Number(ampError, "%.3e").c_str(), Number(phaseError, "%.4f").c_str(),
        Number(growth, "%.5f").c_str(), passedText.c_str());
    return 0;
}
