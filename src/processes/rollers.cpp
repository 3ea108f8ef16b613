// Wave breaking by surface rollers: the settings of WAVE_BREAKING, the start
// state of the roller fields and their renewal before each sweep.
//
// A roller starts with no thickness, the initial (steep) critical slope, and
// the celerity of a developed roller,
//     c = velocity_factor sqrt(g d),  d = max(-bed, minimum_depth),
// along the breaking direction. Before each sweep CalcBreaking renews the
// fields in four passes, each over the whole grid before the next:
//   1. the critical slope relaxes at breaking points towards the final one,
//      tanPhi += (tanFinal - tanPhi) (dt/2) ln 2 / half_time, and is reset to
//      the initial slope where the roller has gone;
//   2. the celerity (cx, cy), of length
//      C = c0 (velocity_factor - r (velocity_factor - 1)), r the share of the
//      slope's way still to go, from c0 at the onset to velocity_factor c0;
//   3. each breaking point hands its slope to the neighbour the roller moves
//      to, so that a breaking front carries its relaxed slope along;
//   4. the thickness grows where the surface rises faster than the slope
//      allows at the roller's speed, and decays at the same gain,
//      delta += (dxi/dt - tanPhi |c|) (dt/2) roller_factor,
//      kept between 0 and the water depth.
// Dry points, porous points and sponge points carry no roller (delta, cx and
// cy are 0 there), nor do the sources of internal generation. Everything is
// computed in 64 bits on the widened 32-bit fields and stored in 32 bits.
#include "processes/rollers.hpp"

#include <algorithm>
#include <atomic>
#include <cmath>
#include <new>

#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "processes/internal_generation.hpp"
#include "processes/porosity.hpp"
#include "processes/sponge.hpp"
#include "run/messages.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/model_state.hpp"

RollerSettings gRollers;

namespace {

constexpr double kDegree = 0.01745329238474369;  // pi/180 as the 32-bit real widened

}  // namespace

void SetupWaveBreaking(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "WAVE_BREAKING");
    RollerSettings& r = gRollers;
    r = RollerSettings{};
    KvtGetInteger(section, "type", r.type);
    if (r.type != 1) return;
    KvtGetDouble(section, "roller_factor", r.rollerFactor);
    KvtGetInteger(section, "velocity_type", r.velocityType);
    KvtGetDouble(section, "velocity_factor", r.velocityFactor);
    KvtGetDouble(section, "velocity_eps", r.velocityEps);
    KvtGetDouble(section, "minimum_depth", r.minimumDepth);
    KvtGetDouble(section, "initial_breaking_angle", r.initialAngle);
    KvtGetDouble(section, "final_breaking_angle", r.finalAngle);
    KvtGetDouble(section, "half_time", r.halfTime);
    const double orientation = gGrid.orientation;
    r.direction = orientation + 270.0;
    KvtGetDouble(section, "direction", r.direction);
    // The default direction runs along the grid's x axis, however the grid lies.
    r.breakDirection = (270.0 - r.direction + orientation) * kDegree;
    if (gBasic.numberOfDimensions != 2) return;  // the angles stay in degrees

    r.tanInitial = std::tan(r.initialAngle * kDegree);
    r.tanFinal = std::tan(r.finalAngle * kDegree);
    const GridState& g = gGrid;
    const size_t n = g.Points();
    try {
        for (std::vector<float>* f :
             {&r.tanPhi, &r.tanPhiOld, &r.delta, &r.deltaOld, &r.cx, &r.cxOld, &r.cy, &r.cyOld})
            f->assign(n, 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    const double gravity = static_cast<double>(kGravity);
    const double cosDir = std::cos(r.breakDirection), sinDir = std::sin(r.breakDirection);
    for (size_t p = 0; p < n; ++p) {
        const double d = std::max(-static_cast<double>(g.bed[p]), r.minimumDepth);
        const double c = std::sqrt(gravity * d) * r.velocityFactor;
        r.cx[p] = r.cxOld[p] = static_cast<float>(c * cosDir);
        r.cy[p] = r.cyOld[p] = static_cast<float>(c * sinDir);
        r.tanPhi[p] = r.tanPhiOld[p] = static_cast<float>(r.tanInitial);
    }
}

namespace {

// What the passes read and write, as plain pointers to the fields.
struct BreakingFields {
    int32_t J, K;
    size_t stride;
    const float *bed, *xi, *xiPrev, *xiPrev2, *depth, *P, *PPrev, *Q, *QPrev;
    const int32_t *codeX, *codeY;
    const uint8_t* blocked;  // kPorousOrSponge, kSource (PrepareBreaking)
    float *tanPhi, *tanPhiOld, *delta, *deltaOld, *cx, *cxOld, *cy, *cyOld;
};

BreakingFields Fields() {
    GridState& g = gGrid;
    RollerSettings& r = gRollers;
    return {g.J,
            g.K,
            g.Stride(),
            g.bed.data(),
            g.xi.data(),
            g.xiPrev.data(),
            g.xiPrev2.data(),
            g.depth.data(),
            g.P.data(),
            g.PPrev.data(),
            g.Q.data(),
            g.QPrev.data(),
            gChains.codeX.data(),
            gChains.codeY.data(),
            r.blocked.data(),
            r.tanPhi.data(),
            r.tanPhiOld.data(),
            r.delta.data(),
            r.deltaOld.data(),
            r.cx.data(),
            r.cxOld.data(),
            r.cy.data(),
            r.cyOld.data()};
}

// A point carries no roller when it is dry, porous or in a sponge.
bool CarriesRoller(const BreakingFields& f, size_t p) {
    if (static_cast<double>(f.xi[p]) - f.bed[p] <= 0.0) return false;
    return (f.blocked[p] & kPorousOrSponge) == 0;
}

// Pass 1: keep the old fields, then relax the critical slope where the
// roller stood and reset it to the initial slope where it did not.
void RelaxSlope(const BreakingFields& f) {
    const RollerSettings& r = gRollers;
    const double a = gGrid.dt * 0.5 * std::log(2.0) / r.halfTime;
    const double tanInitial = r.tanInitial, tanFinal = r.tanFinal;
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= f.K; ++k) {
        const size_t o = static_cast<size_t>(k) * f.stride;
        for (size_t p = o; p < o + f.stride; ++p) {
            f.deltaOld[p] = f.delta[p];
            f.tanPhiOld[p] = f.tanPhi[p];
            f.cxOld[p] = f.cx[p];
            f.cyOld[p] = f.cy[p];
        }
        for (size_t p = o; p < o + f.stride; ++p) {
            const double t = f.tanPhiOld[p];
            f.tanPhi[p] =
                static_cast<float>(f.deltaOld[p] > 0.0f ? t + (tanFinal - t) * a : tanInitial);
        }
    }
}

// Pass 2 at one point p = (j,k) that may carry a roller.
void CelerityAt(const BreakingFields& f, int32_t axis, int32_t j, int32_t k, size_t p) {
    const RollerSettings& r = gRollers;
    const GridState& g = gGrid;
    const int32_t type = r.velocityType;
    if (type < 1 || type > 5) return;  // cx, cy stay as they stood
    const double gravity = static_cast<double>(kGravity);
    const double d = std::max(-static_cast<double>(f.bed[p]), r.minimumDepth);
    const double c0 = std::sqrt(gravity * d);
    // The share of the slope's way from the final to the initial value; with
    // equal angles the slope is final from the start.
    const double span = r.tanInitial - r.tanFinal;
    const double share = span != 0.0 ? (f.tanPhi[p] - r.tanFinal) / span : 0.0;
    const double C = c0 * (r.velocityFactor - share * (r.velocityFactor - 1.0));
    if (type == 3) {
        f.cx[p] = static_cast<float>(C * std::cos(r.breakDirection));
        f.cy[p] = static_cast<float>(C * std::sin(r.breakDirection));
        return;
    }

    // The surface at the level of xiPrev, m = (xi + xiPrev2)/2, and its
    // central gradient; a neighbour across a closed side is the point itself.
    const int32_t jW = std::max(j - 1, 0), jE = std::min(j + 1, f.J);
    const int32_t kS = std::max(k - 1, 0), kN = std::min(k + 1, f.K);
    const size_t stride = f.stride;
    auto m = [&](size_t q) { return (static_cast<double>(f.xi[q]) + f.xiPrev2[q]) * 0.5; };
    const size_t pW = p - (j - jW), pE = p + (jE - j);
    const size_t pS = p - (k - kS) * stride, pN = p + (kN - k) * stride;
    const double mC = m(p);
    double mW = m(pW), mE = m(pE), mS = m(pS), mN = m(pN);
    if (f.codeX[p] == 3) mN = mC;
    if (f.codeX[p] == 2) mS = mC;
    if (f.codeY[p] == 3) mE = mC;
    if (f.codeY[p] == 2) mW = mC;
    const double Sx = (mE - mW) / (2.0 * g.dx), Sy = (mN - mS) / (2.0 * g.dy);
    const double G = std::sqrt(Sx * Sx + Sy * Sy);
    const double St = (static_cast<double>(f.xi[p]) - f.xiPrev2[p]) / g.dt;

    if (type == 4 || type == 5) {
        if (G <= r.velocityEps || std::fabs(St) <= r.velocityEps / c0) {
            f.cx[p] = f.cxOld[p], f.cy[p] = f.cyOld[p];
            return;
        }
        const double W = type == 4 ? -C * (St > 0.0 ? 1.0 : -1.0) : -St / G;
        f.cx[p] = static_cast<float>(Sx / G * W);
        f.cy[p] = static_cast<float>(Sy / G * W);
        return;
    }

    // Types 1 and 2: the velocity of the surface from the mean fluxes at the
    // point, the flux of the other axis averaged over its two time levels.
    double Px, Qy;
    if (axis == 1) {
        Px = (static_cast<double>(f.P[p]) + f.P[pW]) * 0.5;
        Qy = (static_cast<double>(f.Q[p]) + f.QPrev[p] + f.Q[pS] + f.QPrev[pS]) * 0.25;
    } else {
        Qy = (static_cast<double>(f.Q[p]) + f.Q[pS]) * 0.5;
        Px = (static_cast<double>(f.P[p]) + f.PPrev[p] + f.P[pW] + f.PPrev[pW]) * 0.25;
    }
    const double A = f.xiPrev[p];
    const double E = A * A + G * G * d * d;
    double vx = f.cxOld[p], vy = f.cyOld[p];
    if (E > (d * r.velocityEps) * (d * r.velocityEps)) {
        const double T = d * d * St;
        vx = (A * Px - Sx * T) / E;
        vy = (A * Qy - Sy * T) / E;
    }
    if (type == 2) {
        f.cx[p] = static_cast<float>(vx), f.cy[p] = static_cast<float>(vy);
        return;
    }
    const double L = std::sqrt(vx * vx + vy * vy);
    if (L <= static_cast<double>(1e-6f)) {
        f.cx[p] = f.cxOld[p], f.cy[p] = f.cyOld[p];
    } else {
        f.cx[p] = static_cast<float>(vx * C / L);
        f.cy[p] = static_cast<float>(vy * C / L);
    }
}

// Pass 2 of types 1 and 2 over the points j1..j2 of row k, all of them
// inside the grid (0 < j, k < J, K): CelerityAt as one straight pass over
// the rows k-1, k and k+1, with the values of CelerityAt to the last bit.
// (The compiler does not vectorise it: the choices of the celerity formula
// stay branches.)
void CelerityRow(const BreakingFields& f, int32_t axis, int32_t k, int32_t j1, int32_t j2) {
    const RollerSettings& r = gRollers;
    const GridState& g = gGrid;
    const double gravity = static_cast<double>(kGravity);
    const double minimumDepth = r.minimumDepth, vf = r.velocityFactor, eps = r.velocityEps;
    const double tanFinal = r.tanFinal, span = r.tanInitial - r.tanFinal;
    const bool shared = span != 0.0, scaled = r.velocityType == 1;
    const double dx2 = 2.0 * g.dx, dy2 = 2.0 * g.dy, dt = g.dt;
    // Rows k-1, k and k+1 of the fields, each indexed by j, so that every
    // load of the pass has unit stride.
    const size_t o = static_cast<size_t>(k) * f.stride, s = o - f.stride, n = o + f.stride;
    const float* __restrict xi = f.xi + o;
    const float* __restrict xiS = f.xi + s;
    const float* __restrict xiN = f.xi + n;
    const float* __restrict xi2 = f.xiPrev2 + o;
    const float* __restrict xi2S = f.xiPrev2 + s;
    const float* __restrict xi2N = f.xiPrev2 + n;
    const float* __restrict xi1 = f.xiPrev + o;
    const float* __restrict bed = f.bed + o;
    const float* __restrict P = f.P + o;
    const float* __restrict Q = f.Q + o;
    const float* __restrict QS = f.Q + s;
    // The flux of the other axis, over its two time levels.
    const float* __restrict Po = (axis == 1 ? f.P : f.PPrev) + o;
    const float* __restrict Qo = (axis == 1 ? f.QPrev : f.Q) + o;
    const float* __restrict QoS = (axis == 1 ? f.QPrev : f.Q) + s;
    const int32_t* __restrict codeX = f.codeX + o;
    const int32_t* __restrict codeY = f.codeY + o;
    const uint8_t* __restrict blocked = f.blocked + o;
    const float* __restrict tanPhi = f.tanPhi + o;
    const float* __restrict cxOld = f.cxOld + o;
    const float* __restrict cyOld = f.cyOld + o;
    float* __restrict cx = f.cx + o;
    float* __restrict cy = f.cy + o;
    const double tiny = static_cast<double>(1e-6f);
    for (int32_t j = j1; j <= j2; ++j) {
        const double d = std::max(-static_cast<double>(bed[j]), minimumDepth);
        const double c0 = std::sqrt(gravity * d);
        const double share = shared ? (tanPhi[j] - tanFinal) / span : 0.0;
        const double C = c0 * (vf - share * (vf - 1.0));
        const double mC = (static_cast<double>(xi[j]) + xi2[j]) * 0.5;
        const double mW0 = (static_cast<double>(xi[j - 1]) + xi2[j - 1]) * 0.5;
        const double mE0 = (static_cast<double>(xi[j + 1]) + xi2[j + 1]) * 0.5;
        const double mS0 = (static_cast<double>(xiS[j]) + xi2S[j]) * 0.5;
        const double mN0 = (static_cast<double>(xiN[j]) + xi2N[j]) * 0.5;
        const double mN = codeX[j] == 3 ? mC : mN0, mS = codeX[j] == 2 ? mC : mS0;
        const double mE = codeY[j] == 3 ? mC : mE0, mW = codeY[j] == 2 ? mC : mW0;
        const double Sx = (mE - mW) / dx2, Sy = (mN - mS) / dy2;
        const double G = std::sqrt(Sx * Sx + Sy * Sy);
        const double St = (static_cast<double>(xi[j]) - xi2[j]) / dt;
        const double pTwo = (static_cast<double>(P[j]) + P[j - 1]) * 0.5;
        const double pFour = (static_cast<double>(P[j]) + Po[j] + P[j - 1] + Po[j - 1]) * 0.25;
        const double qTwo = (static_cast<double>(Q[j]) + QS[j]) * 0.5;
        const double qFour = (static_cast<double>(Q[j]) + Qo[j] + QS[j] + QoS[j]) * 0.25;
        const double Px = axis == 1 ? pTwo : pFour, Qy = axis == 1 ? qFour : qTwo;
        const double cxo = cxOld[j], cyo = cyOld[j];
        const double A = xi1[j];
        const double E = A * A + G * G * d * d;
        const bool moving = E > (d * eps) * (d * eps);
        const double T = d * d * St, Es = moving ? E : 1.0;
        const double vx = moving ? (A * Px - Sx * T) / Es : cxo;
        const double vy = moving ? (A * Qy - Sy * T) / Es : cyo;
        const double L = std::sqrt(vx * vx + vy * vy);
        const bool still = L <= tiny;
        const double Ls = still ? 1.0 : L;
        const double x1 = still ? cxo : vx * C / Ls, y1 = still ? cyo : vy * C / Ls;
        const bool off =
            (static_cast<double>(xi[j]) - bed[j] <= 0.0) | ((blocked[j] & kPorousOrSponge) != 0);
        const float x = static_cast<float>(scaled ? x1 : vx),
                    y = static_cast<float>(scaled ? y1 : vy);
        cx[j] = off ? 0.0f : x;
        cy[j] = off ? 0.0f : y;
    }
}

// Pass 2 over the points of the x chains of rows 1..K. Types 1 and 2 take
// the straight pass inside the grid; the edges and the other types go point
// by point.
void RenewCelerity(const BreakingFields& f, int32_t axis) {
    const ChainTables& t = gChains;
    const int32_t type = gRollers.velocityType;
    const bool rows = type == 1 || type == 2;
#pragma omp parallel for schedule(static)
    for (int32_t k = 1; k <= f.K; ++k) {
        for (int32_t n = 1; n <= t.chainCountX[k]; ++n) {
            const ChainPair c = t.X(k, n);
            int32_t j1 = c.first, j2 = c.last;
            if (rows && k < f.K) {
                j1 = std::max(c.first, 1), j2 = std::min(c.last, f.J - 1);
                if (j1 <= j2) CelerityRow(f, axis, k, j1, j2);
            }
            for (int32_t j = c.first; j <= c.last; ++j) {
                if (j >= j1 && j <= j2 && rows && k < f.K) continue;
                const size_t p = static_cast<size_t>(k) * f.stride + j;
                if (!CarriesRoller(f, p))
                    f.cx[p] = f.cy[p] = 0.0f;
                else
                    CelerityAt(f, axis, j, k, p);
            }
        }
    }
}

// Pass 3: each point that was breaking hands its slope to the neighbour its
// roller moves to. The neighbour may lie in a row of another thread, and two
// points may hand to the same neighbour; either value is acceptable, and the
// relaxed atomic accesses keep those meetings well defined.
void SpreadSlope(const BreakingFields& f) {
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= f.K; ++k) {
        for (int32_t j = 0; j <= f.J; ++j) {
            const size_t p = static_cast<size_t>(k) * f.stride + j;
            if (!(f.deltaOld[p] > 0.0f)) continue;
            const float cx = f.cx[p], cy = f.cy[p];
            size_t q;
            if (std::fabs(cx) > std::fabs(cy))
                q = cx > 0.0f ? p + (j < f.J) : p - (j > 0);
            else
                q = cy > 0.0f ? p + (k < f.K) * f.stride : p - (k > 0) * f.stride;
            const float slope = std::atomic_ref<float>(f.tanPhi[p]).load(std::memory_order_relaxed);
            std::atomic_ref<float>(f.tanPhi[q]).store(slope, std::memory_order_relaxed);
        }
    }
}

// Pass 4 over the points of the x chains of rows 1..K: the thickness grows
// by the excess of the surface's rise over what the slope allows at the
// roller's speed, within 0 and the water depth.
void RenewThickness(const BreakingFields& f) {
    const ChainTables& t = gChains;
    const double dt = gGrid.dt;
    const double gain = dt * 0.5 * gRollers.rollerFactor;
    const float* __restrict xi = f.xi;
    const float* __restrict xi2 = f.xiPrev2;
    const float* __restrict bed = f.bed;
    const float* __restrict depth = f.depth;
    const float* __restrict tanPhi = f.tanPhi;
    const float* __restrict cxs = f.cx;
    const float* __restrict cys = f.cy;
    const float* __restrict deltaOld = f.deltaOld;
    const uint8_t* __restrict blocked = f.blocked;
    float* __restrict delta = f.delta;
#pragma omp parallel for schedule(static)
    for (int32_t k = 1; k <= f.K; ++k) {
        for (int32_t n = 1; n <= t.chainCountX[k]; ++n) {
            const ChainPair c = t.X(k, n);
            const size_t o = static_cast<size_t>(k) * f.stride;
#pragma GCC ivdep
            for (size_t p = o + c.first; p <= o + c.last; ++p) {
                const double cx = cxs[p], cy = cys[p];
                const double rise = (static_cast<double>(xi[p]) - xi2[p]) / dt;
                const double v =
                    deltaOld[p] + (rise - tanPhi[p] * std::sqrt(cx * cx + cy * cy)) * gain;
                const float kept = static_cast<float>(std::min(std::max(v, 0.0), double{depth[p]}));
                const bool off = (static_cast<double>(xi[p]) - bed[p] <= 0.0) | (blocked[p] != 0);
                delta[p] = off ? 0.0f : kept;
            }
        }
    }
}

}  // namespace

void PrepareBreaking() {
    RollerSettings& r = gRollers;
    const GridState& g = gGrid;
    const size_t n = g.Points();
    try {
        r.blocked.assign(n, 0);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
    const bool porous = gPorosity.porosity.size() == n, sponge = gSponge.sponge.size() == n;
    for (size_t p = 0; p < n; ++p) {
        if ((porous && 1.0 - gPorosity.porosity[p] > 0.0001) ||
            (sponge && static_cast<double>(gSponge.sponge[p]) - 1.0 > 0.0001))
            r.blocked[p] |= kPorousOrSponge;
        if (SourceAt(p) > 0) r.blocked[p] |= kSource;
    }
}

void CalcBreaking(const float* /*xiExt*/, int32_t axis) {
    if (gRollers.blocked.size() != gGrid.Points()) PrepareBreaking();
    const BreakingFields f = Fields();
    RelaxSlope(f);
    RenewCelerity(f, axis);
    SpreadSlope(f);
    RenewThickness(f);
}
