#include "solver2d/scheme_stability.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <complex>
#include <numbers>
#include <vector>

#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

extern "C" {
void zgeev_(const char* jobvl, const char* jobvr, const int* n, std::complex<double>* a,
            const int* lda, std::complex<double>* w, std::complex<double>* vl, const int* ldvl,
            std::complex<double>* vr, const int* ldvr, std::complex<double>* work, const int* lwork,
            double* rwork, int* info);
}

namespace {

using cplx = std::complex<double>;
constexpr int kLevels = 7;  // xi, xiPrev, P, PPrev, Q, QPrev, qxyt
constexpr double kPi = std::numbers::pi;
constexpr double kNoGrowth = 1.0 + 1e-9;
// The largest grid-scale filter proposed: near 1 the filter alone lets the
// checkerboard change sign every step without damping it.
constexpr double kLargestFilter = 0.8;

using State = std::array<cplx, kLevels>;

// One sweep on the mode, along its own axis (ex = exp(i a) along, ey across):
// X the surface before the sweep, F the sweep's flux at the old level, Gnew
// and Gold the newer and older flux across, Gdiff the older time difference
// of it, Xext the estimated surface. Gives the new surface and flux.
void Sweep(const SchemeCase& c, double ds, double dn, cplx ex, cplx ey, cplx X, cplx F, cplx Gold,
           cplx Gnew, cplx Gdiff, cplx Xext, cplx& Xn, cplx& Fn) {
    const double g = static_cast<double>(kGravity), h = c.h, dt = c.dt;
    const double B3 = c.deep ? c.B + 1.0 / 3.0 : static_cast<double>(0.33333334f);
    const double E1 = 1.0 + c.fe * 0.5, E2 = c.fe * 0.5;
    const double G = g * dt * h / (6.0 * ds * ds) + 1.0 / (12.0 * dt) - B3 * h * h / (ds * ds * dt);
    const double cross = -g * dt * h / (6.0 * ds * dn) + h * h * B3 / (ds * dn * dt);
    const double f0 = h * g / ds;
    // Momentum row of a face: G P(j-1) + (1/dt - 2G) P(j) + G P(j+1) - f0 X(j) + f0 X(j+1) = r.
    const cplx corners = (Gnew - Gold) * E1 - Gdiff * E2;
    cplx r =
        F / dt + G * (ex - 2.0 + 1.0 / ex) * F + cross * corners * (ex - 1.0) * (1.0 - 1.0 / ey);
    if (c.deep) {
        const cplx xx0 = (ex - 2.0 + 1.0 / ex) / (ds * ds);
        const cplx yy0 = (ey - 2.0 + 1.0 / ey) / (dn * dn);
        r += c.B * g * h * h * h * ((ex - 1.0) * xx0 / ds + (ex - 1.0) * yy0 / ds) * Xext;
    }
    // Continuity row of a point over half a step, times 2 ds.
    const double Bc = 4.0 * ds / dt;
    const cplx Rc = Bc * X - (1.0 - 1.0 / ex) * F - (Gnew + Gold) * (1.0 - 1.0 / ey) * ds / dn;
    const cplx m11 = 1.0 - 1.0 / ex, m12 = Bc;
    const cplx m21 = G / ex + (1.0 / dt - 2.0 * G) + G * ex, m22 = -f0 + f0 * ex;
    const cplx det = m11 * m22 - m12 * m21;
    Fn = (Rc * m22 - m12 * r) / det;
    Xn = (m11 * r - m21 * Rc) / det;
}

// One time step of the linear scheme on the mode.
State Step(const SchemeCase& c, cplx ex, cplx ey, const State& s) {
    const cplx X = s[0], Xp = s[1], P = s[2], Pp = s[3], Q = s[4], Qp = s[5], qd = s[6];
    const double dt = c.dt, dx = c.dx, dy = c.dy;
    // The x half: the surface at t(m+1/2) from xiPrev with the fluxes at t(m-1/8).
    cplx dPx = (P * 0.875 + Pp * 0.125) * (1.0 - 1.0 / ex);
    cplx dQy = (Q * 0.375 + Qp * 0.625) * (1.0 - 1.0 / ey);
    const cplx extX = Xp - dt * (dPx / dx + dQy / dy);
    cplx X1, P1;
    Sweep(c, dx, dy, ex, ey, X, P, Qp, Q, qd, extX, X1, P1);
    // The y half: the surface at t(m+1) from xiPrev = xi at t(m); the flux
    // across is P, with the time difference pxyt = P - PPrev of the x-sweep.
    dQy = (Q * 0.875 + Qp * 0.125) * (1.0 - 1.0 / ey);
    dPx = (P1 * 0.375 + P * 0.625) * (1.0 - 1.0 / ex);
    const cplx extY = X - dt * (dPx / dx + dQy / dy);
    cplx X2, Q2;
    Sweep(c, dy, dx, ey, ex, X1, Q, P, P1, P - Pp, extY, X2, Q2);
    State out = {X2, X1, P1, P, Q2, Q, Q - Qp};
    if (c.filter > 0.0) {
        const cplx fx = (ex - 2.0 + 1.0 / ex) * (ex - 2.0 + 1.0 / ex);
        const cplx fy = (ey - 2.0 + 1.0 / ey) * (ey - 2.0 + 1.0 / ey);
        const cplx factor = 1.0 - c.filter / 16.0 * (fx + fy);
        for (cplx& v : out) v *= factor;
    }
    return out;
}

}  // namespace

double SpectralRadius(const SchemeCase& c, double a, double b) {
    const cplx ex = std::polar(1.0, a), ey = std::polar(1.0, b);
    // Column i of the matrix (column-major) is the step of unit level i.
    std::array<cplx, kLevels * kLevels> m;
    for (int i = 0; i < kLevels; ++i) {
        State unit{};
        unit[i] = 1.0;
        const State col = Step(c, ex, ey, unit);
        std::copy(col.begin(), col.end(), m.begin() + i * kLevels);
    }
    std::array<cplx, kLevels> w;
    std::array<cplx, 4 * kLevels> work;
    std::array<double, 2 * kLevels> rwork;
    const int n = kLevels, lwork = static_cast<int>(work.size()), one = 1;
    int info = 0;
    cplx dummy;
    zgeev_("N", "N", &n, m.data(), &n, w.data(), &dummy, &one, &dummy, &one, work.data(), &lwork,
           rwork.data(), &info);
    double r = 0.0;
    for (const cplx& v : w) r = std::max(r, std::abs(v));
    // A failed eigenvalue search counts as growth, so that no unstable
    // setting passes for stable.
    return info == 0 ? r : 2.0;
}

SchemeGrowth LargestGrowth(const SchemeCase& c) {
    // A grid of 24 x 24 modes, then a finer grid around the two largest.
    constexpr int n = 24, keep = 2, fine = 6;
    const double step = kPi / n;
    std::vector<SchemeGrowth> all(n * n);
#pragma omp parallel for schedule(static)
    for (int i = 0; i < n * n; ++i) {
        const double a = (i / n + 1) * step, b = (i % n + 1) * step;
        all[i] = {SpectralRadius(c, a, b), a, b};
    }
    std::partial_sort(all.begin(), all.begin() + keep, all.end(),
                      [](const SchemeGrowth& x, const SchemeGrowth& y) { return x.rate > y.rate; });
    SchemeGrowth best = all.front();
    constexpr int side = 2 * fine + 1;
    std::vector<SchemeGrowth> near(side * side);
    for (int t = 0; t < keep; ++t) {
        const SchemeGrowth centre = all[t];
#pragma omp parallel for schedule(static)
        for (int i = 0; i < side * side; ++i) {
            const double a = std::clamp(centre.a + (i / side - fine) * step / fine, 1e-6, kPi);
            const double b = std::clamp(centre.b + (i % side - fine) * step / fine, 1e-6, kPi);
            near[i] = {SpectralRadius(c, a, b), a, b};
        }
        for (const SchemeGrowth& m : near)
            if (m.rate > best.rate) best = m;
    }
    return best;
}

namespace {

// The modes that grew last: a step or a filter that lets one of them grow is
// refused at once, before the search over all modes.
std::vector<std::pair<double, double>> gGrowingModes;

bool Stable(const SchemeCase& c) {
    for (const auto& [a, b] : gGrowingModes)
        if (SpectralRadius(c, a, b) > kNoGrowth) return false;
    const SchemeGrowth g = LargestGrowth(c);
    if (g.rate <= kNoGrowth) return true;
    gGrowingModes.emplace_back(g.a, g.b);
    return false;
}

}  // namespace

bool SchemeStable(const SchemeCase& c) {
    return LargestGrowth(c).rate <= kNoGrowth;
}

double StableTimeStep(SchemeCase c) {
    gGrowingModes.clear();
    if (Stable(c)) return c.dt;
    // To three figures: the bisection ends when the interval is 1/1000 of dt.
    double lo = 0.0, hi = c.dt;
    while (hi - lo > 1e-3 * hi) {
        c.dt = 0.5 * (lo + hi);
        (Stable(c) ? lo : hi) = c.dt;
    }
    return lo;
}

double StableFilter(SchemeCase c) {
    gGrowingModes.clear();
    c.filter = kLargestFilter;
    if (!Stable(c)) return -1.0;
    double lo = 0.0, hi = kLargestFilter;
    while (hi - lo > 0.005) {
        c.filter = 0.5 * (lo + hi);
        (Stable(c) ? hi : lo) = c.filter;
    }
    return hi;
}

namespace {

// The case of the model at still water depth h.
SchemeCase ModelCase(double h) {
    const GridState& g = gGrid;
    const EquationSettings& e = gEquation;
    SchemeCase c;
    c.h = h;
    c.dx = g.dx, c.dy = g.dy, c.dt = g.dt;
    c.deep = e.deepWaterTerms;
    c.B = e.deepWaterTerms ? static_cast<double>(e.dispersionFactor) : 0.0;
    const bool varying = e.depthVaryingExtrapolation == 1 && e.deepWaterTerms;
    c.fe = varying && h >= e.waterDepthLimit ? e.extrapolationUpper : e.extrapolationLower;
    c.filter = e.gridScaleFilter;
    return c;
}

// Three significant figures, or more where a growth factor needs them.
std::string Number(double v, int figures = 3) {
    char text[32];
    std::snprintf(text, sizeof text, "%.*g", figures, v);
    return text;
}

}  // namespace

void ReportSchemeStability() {
    const GridState& g = gGrid;
    // The still water depths of the model: the deepest, and shallower ones
    // in steps of a factor 1.5 down to the shallowest water (at least an
    // eighth of the deepest), since the limits depend on dx/h and the
    // Courant number together.
    double deepest = 0.0, shallowest = 1e30;
    for (size_t p = 0; p < g.Points(); ++p)
        if (g.bed[p] < g.landValue && g.bed[p] < 0.0f) {
            deepest = std::max(deepest, -static_cast<double>(g.bed[p]));
            shallowest = std::min(shallowest, -static_cast<double>(g.bed[p]));
        }
    if (deepest <= 0.0 || g.dt <= 0.0 || g.dx <= 0.0f || g.dy <= 0.0f) return;
    const double floor = std::max(shallowest, deepest / 8.0);
    const double spacing = std::min(g.dx, g.dy);
    const double courant = std::sqrt(static_cast<double>(kGravity) * deepest) * g.dt / spacing;

    WriteBlockHeading("Scheme Stability");
    WriteLine("  Courant number sqrt(g h) dt/dx in the deepest water: " + Number(courant) + " (h " +
              Number(deepest) + " m, dx/h " + Number(spacing / deepest) + ")");
    // The depths looked at, with the growth of their fastest mode.
    std::vector<std::pair<double, double>> growths;
    SchemeGrowth worst;
    double worstDepth = deepest;
    for (double h = deepest; h >= floor * 0.999; h /= 1.5) {
        const SchemeGrowth growth = LargestGrowth(ModelCase(h));
        growths.emplace_back(h, growth.rate);
        if (growth.rate > worst.rate) worst = growth, worstDepth = h;
    }
    const double steps = std::max(1, g.timeStepCount);
    const bool grows = worst.rate > kNoGrowth && std::log(worst.rate) * steps > std::log(10.0);
    WriteLine("  Largest growth of a mode in a step: " + Number(worst.rate, 6) + " (h " +
              Number(worstDepth) + " m)");
    if (grows) {
        // The step and the filter that leave no mode growing at any depth.
        double dt = g.dt, filter = 0.0;
        for (const auto& [h, rate] : growths) {
            if (rate <= kNoGrowth) continue;
            const SchemeCase c = ModelCase(h);
            dt = std::min(dt, StableTimeStep(c));
            const double f = StableFilter(c);
            filter = (f < 0.0 || filter < 0.0) ? -1.0 : std::max(filter, f);
        }
        const double worstCourant =
            std::sqrt(static_cast<double>(kGravity) * worstDepth) * g.dt / spacing;
        ReportWarning("Time step beyond the stable range of the scheme");
        WriteLine("  The shortest waves of the grid grow by " + Number(100.0 * (worst.rate - 1.0)) +
                  " % a step in " + Number(worstDepth) + " m of water");
        WriteLine("  (Courant number " + Number(worstCourant) + ", dx/h " +
                  Number(spacing / worstDepth) + "). Stable at every depth of the model:");
        WriteLine("  a Time_step_interval of " + Number(dt) + " s or less" +
                  (filter > gEquation.gridScaleFilter
                       ? ", or a Grid_scale_filter of " + Number(filter) + "."
                       : "."));
        WriteLine("  See docs/numerics.md for the stable and accurate settings.");
    }
    WriteBlockHeading("");
}
