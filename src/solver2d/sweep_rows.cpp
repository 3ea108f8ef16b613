#include "solver2d/sweep_rows.hpp"

#include <algorithm>
#include <cmath>
#include <limits>
#include <type_traits>

#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/sweeps.hpp"

namespace {

const float kNone[1] = {0.0f};

// The rule of neighbours across a line: a land neighbour mirrors the line.
inline bool NorthAllowed(int32_t code) {
    return code == 4 || code == 2;
}
inline bool SouthAllowed(int32_t code) {
    return code == 4 || code == 3;
}

// The row of boundary b's table that holds point (j,k) of the grid.
int32_t TableRow(int32_t b, int32_t j, int32_t k) {
    const BoundaryRecord& r = Boundary(b);
    return (r.orientation == 1 || r.orientation == 3) ? k - r.first[1] : j - r.first[0];
}

// The boundary of a mark at a chain's end; none is a blow-up.
int32_t EndBoundary(const AxisView& v, int32_t j, int32_t k) {
    const int32_t gj = v.axis == 1 ? j : k, gk = v.axis == 1 ? k : j;
    const int32_t b = FindBoundary(gj, gk, v.endAxis);
    if (b == 0) BlowUp("Undefined open boundary point, near (%,%)", gj, gk);
    return b;
}

}  // namespace

void ChainRows::Reserve(int32_t points) {
    if (points <= capacity) return;
    capacity = points;
    const size_t n = static_cast<size_t>(points) + 3;
    for (auto* r : {&p,   &pN,  &pS,  &qC,  &qS, &qCo, &qSo, &sE, &sEN, &sES, &dE, &dEN,
                    &dES, &por, &c,   &dpt, &D,  &gD,  &gDS, &nP, &dP,  &DP,  &Dx, &Dy,
                    &U,   &Fr,  &fac, &da,  &db, &dc,  &dr,  &m1, &m2,  &m3,  &m4, &rr})
        r->assign(n, 0.0f);
    src.assign(n, 0);
    for (auto* r : {&uE, &uW, &vN, &vS}) r->assign(n, 0.0);
    solve.assign(7 * (2 * n + 4), 0.0f);
}

AxisView MakeAxisView(int32_t axis) {
    GridState& g = gGrid;
    GenerationState& s = gGeneration;
    const bool gen = s.numberOfRecords > 0;
    const bool deep = gen && gEquation.deepWaterTerms;
    AxisView v;
    v.axis = axis;
    if (axis == 1) {
        v.n = g.J;
        v.lines = g.K;
        v.along = 1;
        v.across = g.Stride();
        v.ds = g.dx;
        v.dn = g.dy;
        v.F = g.P.data(), v.FPrev = g.PPrev.data(), v.FDiff = g.pxyt.data(),
        v.FEdge = g.PWest.data();
        v.G = g.Q.data(), v.GPrev = g.QPrev.data(), v.GDiff = g.qxyt.data();
        v.codeN = gChains.codeX.data(), v.codeE = gChains.codeY.data();
        v.chainCount = &gChains.chainCountX, v.chains = &gChains.chainX;
        v.maxChains = gChains.maxChainsX;
        v.xiExt = g.xiExtX.data(), v.depthExt = g.depthExtX.data();
        v.coriolisSign = 1.0;
        v.levelColumn = 2, v.replaceColumn = 4, v.gradientColumn = 6;
        v.endAxis = 1;
        v.sF = gen ? s.sourceP.data() : kNone, v.sFPrev = gen ? s.sourcePPrev.data() : kNone;
        v.sG = gen ? s.sourceQ.data() : kNone, v.sGPrev = gen ? s.sourceQPrev.data() : kNone;
        v.sGPrev2 = gen ? s.sourceQPrev2.data() : kNone;
        v.sXiAlong = deep ? s.sourceXiX.data() : kNone;
        v.sXiAcross = deep ? s.sourceXiY.data() : kNone;
        v.xi = g.xi.data(), v.bed = g.bed.data(), v.porosity = gPorosity.porosity.data();
        v.depth = g.depth.data(), v.xiPrev = g.xiPrev.data();
        v.friction = gFriction.resistanceType == 2 ? gFriction.frictionCoef.data() : nullptr;
        v.nu = gEddy.eddyViscosity.data();
        v.delta = gRollers.delta.data(), v.cAlong = gRollers.cx.data(),
        v.cAcross = gRollers.cy.data();
        v.source = gen ? s.sourceIndex.data() : nullptr;
    } else {
        ColumnCopies& c = gColumns;
        v.n = g.K;
        v.lines = g.J;
        v.along = 1;
        v.across = static_cast<size_t>(g.K) + 1;
        v.ds = g.dy;
        v.dn = g.dx;
        v.F = c.Q.data(), v.FPrev = c.QPrev.data(), v.FDiff = c.qxyt.data(),
        v.FEdge = g.QSouth.data();
        v.G = c.P.data(), v.GPrev = c.PPrev.data(), v.GDiff = c.pxyt.data();
        v.codeN = c.codeN.data(), v.codeE = c.codeE.data();
        v.chainCount = &gChains.chainCountY, v.chains = &gChains.chainY;
        v.maxChains = gChains.maxChainsY;
        v.xiExt = c.xiExt.data(), v.depthExt = c.depthExt.data();
        v.xi = c.xi.data(), v.bed = c.bed.data(), v.porosity = c.porosity.data();
        v.depth = c.depth.data(), v.xiPrev = c.xiPrev.data();
        v.friction = gFriction.resistanceType == 2 ? c.friction.data() : nullptr;
        v.nu = c.nu.data();
        v.delta = c.delta.data(), v.cAlong = c.cy.data(), v.cAcross = c.cx.data();
        v.source = gen ? c.source.data() : nullptr;
        v.coriolisSign = -1.0;
        v.levelColumn = 1, v.replaceColumn = 3, v.gradientColumn = 5;
        v.endAxis = 2;
        v.sF = gen ? s.sourceQ.data() : kNone, v.sFPrev = gen ? s.sourceQPrev.data() : kNone;
        v.sG = gen ? s.sourceP.data() : kNone, v.sGPrev = gen ? s.sourcePPrev.data() : kNone;
        v.sGPrev2 = gen ? s.sourcePPrev2.data() : kNone;
        v.sXiAlong = deep ? s.sourceXiY.data() : kNone;
        v.sXiAcross = deep ? s.sourceXiX.data() : kNone;
    }
    return v;
}

SweepConstants MakeSweepConstants(const AxisView& v) {
    SweepConstants s;
    s.B = gEquation.deepWaterTerms ? static_cast<double>(gEquation.dispersionFactor) : 0.0;
    s.B3 = gEquation.deepWaterTerms ? s.B + 1.0 / 3.0 : static_cast<double>(0.33333334f);
    s.fc = std::sin(gGrid.latitude) * static_cast<double>(1.458e-4f) * 0.5;
    s.dt = gGrid.dt;
    s.dx = v.ds;
    s.dy = v.dn;
    s.a1 = 1.0 / (12.0 * s.dx * s.dt);
    s.g1 = s.g * s.dt / (6.0 * s.dx * s.dx);
    s.g2 = 1.0 / (12.0 * s.dt);
    s.g3 = s.B3 / (s.dx * s.dx * s.dt);
    s.t0 = 1.0 / (12.0 * s.dy * s.dt);
    s.x1 = -s.g * s.dt / (6.0 * s.dx * s.dy);
    s.x2 = s.B3 / (s.dx * s.dy * s.dt);
    return s;
}

void CheckChainDepth(const AxisView& v, int32_t k, int32_t first, int32_t last) {
    const float* depth = v.depth;
    for (int32_t j = first; j <= last; ++j) {
        const float d = depth[v.At(j, k)];
        // Written so that a not-a-number fails too: once one is in the state
        // it spreads over the grid, and the run must end here as a blow-up
        // rather than fill its outputs with it.
        if (!(d >= 0.0001f && d <= 1e10f)) {
            const char* text = d != d ? "Water depth is not a number, near (%,%)"
                                      : "Negative water depth, near (%,%)";
            if (v.axis == 1) BlowUp(text, j, k);
            BlowUp(text, k, j);
        }
    }
}

BW_VECTOR_CLONES
void LoadChainRows(const AxisView& v, int32_t k, int32_t first, int32_t last, bool central,
                   ChainRows& w) {
    const int32_t m = last - first + 1;
    w.Reserve(m + 2);
    const float* Fold = central ? v.F : v.FPrev;
    const float* bed = v.bed;
    const float* depth = v.depth;
    const float* xiPrev = v.xiPrev;
    const float* porosity = v.porosity;
    const bool slot = gShoreline.type > 0;
    const bool deep = gEquation.deepWaterTerms;
    const bool gen = gGeneration.numberOfRecords > 0;
    const size_t up = v.across, base = v.At(first, k);

    // Point rows. Lines 0 and K are never assembled, so the neighbouring
    // lines exist; their values are taken where the codes allow, else the
    // line's own (selects, so that the passes vectorise).
    // Both views run along memory (along is 1), which the passes below use.
    const int32_t* code = v.codeN + base;
    {
        float* __restrict p = w.p.data();
        float* __restrict qC = w.qC.data();
        float* __restrict qS = w.qS.data();
        float* __restrict qCo = w.qCo.data();
        float* __restrict qSo = w.qSo.data();
        float* __restrict gD = w.gD.data();
        float* __restrict gDS = w.gDS.data();
        float* __restrict dE = w.dE.data();
        float* __restrict dEN = w.dEN.data();
        float* __restrict dES = w.dES.data();
        float* __restrict por = w.por.data();
        float* __restrict dpt = w.dpt.data();
        float* __restrict D = w.D.data();
        const float* F0 = Fold + base;
        const float* G = v.G + base;
        const float* GP = v.GPrev + base;
        const float* GD = v.GDiff + base;
        const float* DE = v.depthExt + base;
        const float* PO = porosity + base;
        const float* DP = depth + base;
        const float* BD = bed + base;
#pragma GCC ivdep
        for (int32_t r = 1; r <= m; ++r) {
            const size_t i = r - 1;
            const int32_t cd = code[i];
            const bool nOk = cd == 4 || cd == 2, sOk = cd == 4 || cd == 3;
            p[r] = F0[i];
            qC[r] = G[i];
            qS[r] = G[i - up];
            qCo[r] = GP[i];
            qSo[r] = GP[i - up];
            gD[r] = GD[i];
            gDS[r] = GD[i - up];
            const float d = DE[i], dn = DE[i + up], ds = DE[i - up];
            dE[r] = d;
            dEN[r] = nOk ? dn : d;
            dES[r] = sOk ? ds : d;
            por[r] = PO[i];
            dpt[r] = DP[i];
            D[r] = -BD[i];
        }
    }
    if (deep) {
        for (int32_t r = 1; r <= m; ++r) {
            const size_t pt = base + (r - 1);
            const int32_t cd = code[(r - 1)];
            const bool nOk = NorthAllowed(cd), sOk = SouthAllowed(cd);
            w.sE[r] = v.xiExt[pt];
            w.sEN[r] = nOk ? v.xiExt[pt + up] : w.sE[r];
            w.sES[r] = sOk ? v.xiExt[pt - up] : w.sE[r];
        }
    }
    if (slot) {
        for (int32_t r = 1; r <= m; ++r) {
            const size_t pt = base + (r - 1);
            w.c[r] = StorageWidthAt(v.axis == 1 ? first + r - 1 : k,
                                    v.axis == 1 ? k : first + r - 1, xiPrev[pt]);
        }
    } else {
        for (int32_t r = 1; r <= m; ++r) w.c[r] = 1.0f;
    }
    if (gen) {
        for (int32_t r = 1; r <= m; ++r) w.src[r] = v.source[base + r - 1];
        w.src[0] = w.src[m + 1] = 0;
    }
    // Fluxes of the neighbouring lines at the faces: both points must allow.
    {
        float* __restrict pN = w.pN.data();
        float* __restrict pS = w.pS.data();
        const float* p = w.p.data();
        const float* F0 = Fold + base;
        auto face = [&](int32_t r, int32_t c1) {
            const size_t i = r - 1;
            const int32_t c0 = code[i];
            // Bitwise, not short-circuit: no branch in the pass.
            const bool nOk = ((c0 == 4) | (c0 == 2)) & ((c1 == 4) | (c1 == 2));
            const bool sOk = ((c0 == 4) | (c0 == 3)) & ((c1 == 4) | (c1 == 3));
            const float fn = F0[i + up], fs = F0[i - up];
            pN[r] = nOk ? fn : p[r];
            pS[r] = sOk ? fs : p[r];
        };
        // The last point of a chain at the line's end has no point beyond:
        // its own code stands for both.
#pragma GCC ivdep
        for (int32_t r = 1; r < m; ++r) face(r, code[r]);
        face(m, last < v.n ? code[m] : code[m - 1]);
    }

    // Ends: land closes the chain; a level boundary brings its outer flux
    // and the curvature of the surface across it.
    w.p[0] = 0.0f;
    w.p[m + 1] = 0.0f;
    w.sE[0] = w.sE[m + 1] = 0.0f;
    const int32_t west = v.codeE[base];
    const int32_t east = v.codeE[base + (m - 1) * v.along];
    const float ds2 = v.ds * v.ds;
    if (west == kCodeLevelBoundary) {
        const int32_t b = EndBoundary(v, first, k);
        const BoundaryTable& t = BoundaryValues(b);
        const int32_t s = TableRow(b, v.axis == 1 ? first : k, v.axis == 1 ? k : first);
        if (Boundary(b).dataSpecification == 2)
            w.p[0] = t.Value(s, v.replaceColumn);
        else
            w.p[0] = first == 0 ? v.FEdge[k] : v.F[base - v.along];
        if (deep) w.sE[0] = ds2 * t.Value(s, v.gradientColumn) + 2.0f * w.sE[1] - w.sE[2];
    } else if (west == 2 && deep) {
        w.sE[0] = w.sE[1];
    }
    if (east == kCodeLevelBoundary) {
        const int32_t b = EndBoundary(v, last, k);
        const BoundaryTable& t = BoundaryValues(b);
        const int32_t s = TableRow(b, v.axis == 1 ? last : k, v.axis == 1 ? k : last);
        if (Boundary(b).dataSpecification == 2) w.p[m] = t.Value(s, v.replaceColumn);
        if (deep) w.sE[m + 1] = 2.0f * w.sE[m] - w.sE[m - 1] + ds2 * t.Value(s, v.gradientColumn);
    } else if (east == 3 && deep) {
        w.sE[m + 1] = w.sE[m];
    }

    // Face rows.
    {
        const float* D = w.D.data();
        const float* por = w.por.data();
        const float* dE = w.dE.data();
        float* __restrict nP = w.nP.data();
        float* __restrict dP = w.dP.data();
        float* __restrict DP = w.DP.data();
        float* __restrict Dx = w.Dx.data();
        const float ds = v.ds;
#pragma GCC ivdep
        for (int32_t r = 1; r < m; ++r) {
            nP[r] = (por[r] + por[r + 1]) * 0.5f;
            dP[r] = (dE[r] + dE[r + 1]) * 0.5f;
            DP[r] = (D[r] + D[r + 1]) * 0.5f;
            Dx[r] = (D[r + 1] - D[r]) / ds;
        }
    }
    {
        // The neighbours' depths are read at every point and kept where the
        // codes allow (the neighbouring lines exist), so that the pass vectorises.
        const float* __restrict D = w.D.data();
        const float* __restrict BN = bed + base + up;
        const float* __restrict BS = bed + base - up;
        float* __restrict Dy = w.Dy.data();
        const double dn = v.dn;
#pragma GCC ivdep
        for (int32_t r = 1; r < m; ++r) {
            const int32_t c0 = code[r - 1], c1 = code[r];
            const float D0 = D[r], D1 = D[r + 1];
            const float n0 = -BN[r - 1], s0 = -BS[r - 1], n1 = -BN[r], s1 = -BS[r];
            const float DN0 = (c0 == 4 || c0 == 2) ? n0 : D0;
            const float DS0 = (c0 == 4 || c0 == 3) ? s0 : D0;
            const float DN1 = (c1 == 4 || c1 == 2) ? n1 : D1;
            const float DS1 = (c1 == 4 || c1 == 3) ? s1 : D1;
            Dy[r] = static_cast<float>(
                ((static_cast<double>(DN0) - DS0) + (static_cast<double>(DN1) - DS1)) * 0.25 / dn);
        }
    }
    if (gen)
        for (int32_t r = 1; r < m; ++r)
            w.fac[r] = (w.src[r] >= 1 || w.src[r + 1] >= 1) ? 0.0f : 1.0f;
    else
        for (int32_t r = 1; r < m; ++r) w.fac[r] = 1.0f;
}

BW_VECTOR_CLONES
void FrictionRows(const AxisView& v, int32_t k, int32_t first, int32_t last, ChainRows& w) {
    const int32_t m = last - first + 1;
    const size_t base = v.At(first, k);
    const float* __restrict qC = w.qC.data();
    const float* __restrict qS = w.qS.data();
    const float* __restrict qCo = w.qCo.data();
    const float* __restrict qSo = w.qSo.data();
    const float* __restrict p = w.p.data();
    float* __restrict U = w.U.data();
    float* __restrict Fr = w.Fr.data();
#pragma GCC ivdep
    for (int32_t r = 1; r < m; ++r) {
        const float qm =
            (qC[r] + qC[r + 1] + qS[r] + qS[r + 1] + qCo[r] + qCo[r + 1] + qSo[r] + qSo[r + 1]) *
            0.125f;
        U[r] = std::sqrt(qm * qm + p[r] * p[r]);
    }
    if (gFriction.resistanceType == 0) {
        for (int32_t r = 1; r < m; ++r) Fr[r] = 0.0f;
        return;
    }
    const bool chezy = gFriction.formulation == 1;
    for (int32_t r = 1; r < m; ++r) {
        const float F = v.friction != nullptr ? v.friction[base + (r - 1) * v.along]
                                              : gFriction.frictionConstant;
        const float h1 = w.dpt[r], h2 = w.dpt[r + 1];
        const float hf = std::sqrt(2.0f / (1.0f / (h1 * h1) + 1.0f / (h2 * h2)));
        if (chezy) {
            Fr[r] = F / (hf * hf);
        } else {
            const float x = 0.166667f * std::log(hf);
            const float E = ((x * 0.166667f + 0.5f) * x + 1.0f) * x + 1.0f;
            Fr[r] = F / (hf * hf * E * E);
        }
    }
}

// Largest fraction of the depth a roller takes in its momentum flux.
constexpr double kRollerFraction = 0.5;

void RollerRows(const AxisView& v, int32_t k, int32_t first, int32_t last, ChainRows& w) {
    const int32_t m = last - first + 1;
    if (gRollers.type != 1 || gRollers.delta.empty()) {
        for (int32_t r = 1; r < m; ++r) w.rr[r] = 0.0f;
        return;
    }
    const float* delta = v.delta;
    const float* cAlong = v.cAlong;
    const float* cAcross = v.cAcross;
    const size_t up = v.across, base = v.At(first, k);
    // The roller's share of the momentum flux, delta / (1 - delta/d). At the
    // waterline a roller may fill the whole of a shallow face (delta up to
    // the point's depth, and the face's estimated depth may be smaller), and
    // the share would grow without bound; it is held at twice the thickness,
    // which leaves every roller thinner than half the depth as it is.
    auto wf = [](double a, double b) {
        const double r = a < kRollerFraction * b ? a / b : kRollerFraction;
        return a / (1.0 - r);
    };
    for (int32_t r = 1; r < m; ++r) {
        const size_t p0 = base + (r - 1) * v.along, p1 = p0 + v.along;
        const int32_t c0 = v.codeN[p0], c1 = v.codeN[p1];
        const bool nOk = NorthAllowed(c0) && NorthAllowed(c1);
        const bool sOk = SouthAllowed(c0) && SouthAllowed(c1);
        const size_t n0 = nOk ? p0 + up : p0, n1 = nOk ? p1 + up : p1;
        const size_t s0 = sOk ? p0 - up : p0, s1 = sOk ? p1 - up : p1;
        const float big =
            std::max({delta[p0], delta[p1], delta[n0], delta[n1], delta[s0], delta[s1]});
        if (big < 1e-6f) {
            w.rr[r] = 0.0f;
            continue;
        }
        const double dN =
            (static_cast<double>(w.dEN[r]) + w.dE[r] + w.dE[r + 1] + w.dEN[r + 1]) * 0.25;
        const double dS =
            (static_cast<double>(w.dE[r]) + w.dE[r + 1] + w.dES[r] + w.dES[r + 1]) * 0.25;
        auto mean = [&](const float* a, size_t x0, size_t x1, size_t x2, size_t x3) {
            return (static_cast<double>(a[x0]) + a[x1] + a[x2] + a[x3]) * 0.25;
        };
        const double deltaN = mean(delta, n0, p0, p1, n1), deltaS = mean(delta, p0, p1, s0, s1);
        const double caN = mean(cAlong, n0, p0, p1, n1), caS = mean(cAlong, p0, p1, s0, s1);
        const double ccN = mean(cAcross, n0, p0, p1, n1), ccS = mean(cAcross, p0, p1, s0, s1);
        const double north = (ccN - 2.0 * (w.qC[r] + w.qC[r + 1]) / (4.0 * dN)) * wf(deltaN, dN) *
                             (caN - ((static_cast<double>(w.pN[r]) + w.p[r]) * 0.5) / dN);
        const double south = (ccS - 2.0 * (w.qS[r] + w.qS[r + 1]) / (4.0 * dS)) * wf(deltaS, dS) *
                             (caS - ((static_cast<double>(w.p[r]) + w.pS[r]) * 0.5) / dS);
        const double ex0 =
            cAlong[p0] - ((static_cast<double>(w.p[r - 1]) + w.p[r]) * 0.5) / w.dE[r];
        const double ex1 =
            cAlong[p1] - ((static_cast<double>(w.p[r]) + w.p[r + 1]) * 0.5) / w.dE[r + 1];
        const double along =
            wf(delta[p1], w.dE[r + 1]) * ex1 * ex1 - wf(delta[p0], w.dE[r]) * ex0 * ex0;
        w.rr[r] = static_cast<float>(-(north - south) / v.dn - along / v.ds);
    }
}

void EddyRows(const AxisView& v, int32_t k, int32_t first, int32_t last, int32_t flag,
              ChainRows& w) {
    const int32_t m = last - first + 1;
    const int32_t type = gEddy.eddyType;
    if (type != 1 && type != 2) {
        for (int32_t r = 1; r < m; ++r) w.m1[r] = w.m2[r] = w.m3[r] = w.m4[r] = 0.0f;
        return;
    }
    const float* nu = v.nu;
    const size_t up = v.across, base = v.At(first, k);
    const double dx = v.ds, dy = v.dn;
    for (int32_t r = 1; r < m; ++r) {
        const size_t p0 = base + (r - 1) * v.along, p1 = p0 + v.along;
        double m1, m2, m3, m4;
        if (type == 1) {
            const double n0 = nu[p0];
            m1 = m3 = -n0 / (dx * dx);
            m2 = 2.0 * n0 / (dx * dx) + n0 / (dy * dy);
            m4 = (n0 / (dy * dy)) * (static_cast<double>(w.pN[r]) - w.p[r] + w.pS[r]);
        } else {
            const double nu0 = nu[p0], nu1 = nu[p1];
            const double nuN0 = NorthAllowed(v.codeN[p0]) ? nu[p0 + up] : nu0;
            const double nuN1 = NorthAllowed(v.codeN[p1]) ? nu[p1 + up] : nu1;
            const double nuS0 = SouthAllowed(v.codeN[p0]) ? nu[p0 - up] : nu0;
            const double nuS1 = SouthAllowed(v.codeN[p1]) ? nu[p1 - up] : nu1;
            const double nuN = (nuN0 + nu0 + nu1 + nuN1) * 0.25;
            const double nuS = (nuS0 + nu0 + nu1 + nuS1) * 0.25;
            const double dP = w.dP[r], f = flag;
            m1 = -nu0 * dP / (dx * dx);
            m3 = -nu1 * dP / (dx * dx);
            m2 = dP * ((nu0 + nu1) / (dx * dx) + (f * nuN + (1.0 - f) * nuS) * 0.5 / (dy * dy));
            m4 = (dP * 0.5 / dy) *
                 (((w.pN[r] - (1.0 - f) * w.p[r]) * nuN - (f * w.p[r] - w.pS[r]) * nuS) / dy +
                  ((static_cast<double>(w.qC[r + 1]) - w.qC[r]) * nuN -
                   (static_cast<double>(w.qS[r + 1]) - w.qS[r]) * nuS) /
                      dx);
        }
        const double t = w.src[r] >= 1 ? 0.0 : w.nP[r];
        w.m1[r] = static_cast<float>(m1 * t);
        w.m2[r] = static_cast<float>(m2 * t);
        w.m3[r] = static_cast<float>(m3 * t);
        w.m4[r] = static_cast<float>(m4 * t);
    }
}

namespace {

// The time differences of the sources of internal generation between the
// two points of each face, in the dispersion terms.
void DispersionSourceRows(const AxisView& v, const SweepConstants& s, int32_t first, int32_t last,
                          bool central, ChainRows& w) {
    const int32_t m = last - first + 1;
    const EquationSettings& e = gEquation;
    const bool varying = e.depthVaryingExtrapolation == 1 && e.deepWaterTerms;
    for (int32_t r = 1; r < m; ++r) {
        const int32_t i = w.src[r], i2 = w.src[r + 1];
        if (i < 1 && i2 < 1) continue;
        const bool on = central ? w.DP[r] > 0.0f : w.D[r] > 0.0f;
        if (!on) continue;
        double s1 = 0.0, s2 = 0.0, s3 = 0.0;
        if (i2 >= 1) {
            s1 += static_cast<double>(v.sF[i2]) - v.sFPrev[i2];
            s2 += static_cast<double>(v.sG[i2]) - v.sGPrev[i2];
            s3 += static_cast<double>(v.sGPrev[i2]) - v.sGPrev2[i2];
        }
        if (i >= 1) {
            s1 -= static_cast<double>(v.sF[i]) - v.sFPrev[i];
            s2 -= static_cast<double>(v.sG[i]) - v.sGPrev[i];
            s3 -= static_cast<double>(v.sGPrev[i]) - v.sGPrev2[i];
        }
        const double nP = w.nP[r], dP = w.dP[r], DP = w.DP[r];
        const double fe =
            varying ? (w.D[r] >= e.waterDepthLimit ? e.extrapolationUpper : e.extrapolationLower)
                    : e.extrapolationLower;
        const bool plain = 1.0 - nP >= 0.0001 && gPorosity.noExtrapolation;
        const double E1 = plain ? 1.0 : 1.0 + fe * 0.5, E2 = plain ? 0.0 : fe * 0.5;
        double G = dP * nP * s.g1 + s.g2 - DP * DP * nP * s.g3;
        if (central) G = static_cast<float>(G);
        const double cross = dP * nP * s.x1 + DP * DP * nP * s.x2;
        w.dr[r] = static_cast<float>(w.dr[r] + G * s1 + cross * (-s2 * E1 + s3 * E2));
    }
}

// The deep-water terms B g D^2 n^2 (D (xi_xxx + xi_xyy) + D_x (2 xi_xx + xi_yy) + D_y xi_xy)
// of the extrapolated surface, into dr.
void DeepWaterRows(const AxisView& v, const SweepConstants& s, int32_t first, int32_t last,
                   bool central, ChainRows& w) {
    const int32_t m = last - first + 1;
    const double dx = s.dx, dy = s.dy, idx2 = 1.0 / (dx * dx), idy2 = 1.0 / (dy * dy);
    const double idx = 1.0 / dx, idxdy = 1.0 / (dx * dy), Bg = s.B * s.g;
    const bool gen = gGeneration.numberOfRecords > 0;
    const float* sE = w.sE.data();
    const float* sEN = w.sEN.data();
    const float* sES = w.sES.data();
    for (int32_t r = 1; r < m; ++r) {
        const bool on = central ? w.DP[r] > 0.0f : w.D[r] > 0.0f;
        if (!on) continue;
        const double xx1 = (static_cast<double>(sE[r + 2]) - 2.0 * sE[r + 1] + sE[r]) * idx2;
        const double xx0 = (static_cast<double>(sE[r + 1]) - 2.0 * sE[r] + sE[r - 1]) * idx2;
        const double yy1 = (static_cast<double>(sEN[r + 1]) - 2.0 * sE[r + 1] + sES[r + 1]) * idy2;
        const double yy0 = (static_cast<double>(sEN[r]) - 2.0 * sE[r] + sES[r]) * idy2;
        double xxx = (xx1 - xx0) * idx, xyy = (yy1 - yy0) * idx;
        if (gen) {
            const int32_t i = w.src[r], i2 = w.src[r + 1];
            if (i >= 1) xxx += v.sXiAlong[i] * idx2, xyy += v.sXiAcross[i] * idxdy;
            if (i2 >= 1) xxx -= v.sXiAlong[i2] * idx2, xyy -= v.sXiAcross[i2] * idxdy;
        }
        const double xx = (xx1 + xx0) * 0.5;
        const double xy =
            ((static_cast<double>(sEN[r + 1]) - sES[r + 1] - sEN[r] + sES[r]) * 0.5) * idxdy;
        const double nP = w.nP[r], DP = w.DP[r];
        w.dr[r] = static_cast<float>(w.dr[r] + Bg * DP * DP * nP * nP *
                                                   (w.Dx[r] * (2.0 * xx + (yy1 + yy0) * 0.5) +
                                                    w.Dy[r] * xy + DP * (xxx + xyy)));
    }
}

}  // namespace

BW_VECTOR_CLONES
void DispersionRows(const AxisView& v, const SweepConstants& s, int32_t k, int32_t first,
                    int32_t last, bool central, ChainRows& w) {
    (void)k;
    const int32_t m = last - first + 1;
    const EquationSettings& e = gEquation;
    const bool varying = e.depthVaryingExtrapolation == 1 && e.deepWaterTerms;
    const double lower = e.extrapolationLower, upper = e.extrapolationUpper;
    const float limit = e.waterDepthLimit;
    const bool noExtrapolation = gPorosity.noExtrapolation;
    const double alpha = central ? gPorosity.alpha : 0.0;
    const double a1 = s.a1, g1 = s.g1, g2 = s.g2, g3 = s.g3, t0 = s.t0, x1 = s.x1, x2 = s.x2;
    const float* __restrict D = w.D.data();
    const float* __restrict nPr = w.nP.data();
    const float* __restrict dPr = w.dP.data();
    const float* __restrict DPr = w.DP.data();
    const float* __restrict Dxr = w.Dx.data();
    const float* __restrict Dyr = w.Dy.data();
    const float* __restrict p = w.p.data();
    const float* __restrict qC = w.qC.data();
    const float* __restrict qS = w.qS.data();
    const float* __restrict qCo = w.qCo.data();
    const float* __restrict qSo = w.qSo.data();
    const float* __restrict gD = w.gD.data();
    const float* __restrict gDS = w.gDS.data();
    float* __restrict da = w.da.data();
    float* __restrict db = w.db.data();
    float* __restrict dc = w.dc.data();
    float* __restrict dr = w.dr.data();
    // Central sweeps test the face's still water depth, the upwind ones the
    // bed at j; without depth-varying extrapolation no depth reaches the limit.
    const float* __restrict onDepth = central ? DPr : D;
    const float feLimit = varying ? limit : std::numeric_limits<float>::infinity();
    // One pass for each kind of sweep, so that the rounding of G is no
    // select inside the loop.
    auto pass = [&](auto kind) {
        constexpr bool kCentral = decltype(kind)::value;
#pragma GCC ivdep
        for (int32_t r = 1; r < m; ++r) {
            const double nP = nPr[r], dP = dPr[r], DP = DPr[r], Dx = Dxr[r], Dy = Dyr[r];
            const bool porous = 1.0 - nP >= 0.0001;
            const double fe = D[r] >= feLimit ? upper : lower;
            const bool plain = porous & noExtrapolation;
            const double E1 = plain ? 1.0 : 1.0 + fe * 0.5, E2 = plain ? 0.0 : fe * 0.5;
            // Time differences of G at the four corners of the face, extrapolated.
            const double t1 = (static_cast<double>(qC[r + 1]) - qCo[r + 1]) * E1 - gD[r + 1] * E2;
            const double t2 = (static_cast<double>(qS[r + 1]) - qSo[r + 1]) * E1 - gDS[r + 1] * E2;
            const double t3 = (static_cast<double>(qC[r]) - qCo[r]) * E1 - gD[r] * E2;
            const double t4 = (static_cast<double>(qS[r]) - qSo[r]) * E1 - gDS[r] * E2;
            const double A1 = DP * nP * a1;
            const double G0 = dP * nP * g1 + g2 - DP * DP * nP * g3;
            const double G = kCentral ? static_cast<double>(static_cast<float>(G0)) : G0;
            const double H1 = 2.0 * A1 * Dx;
            const double pE = p[r + 1], pC = p[r], pW = p[r - 1];
            const double cross = dP * nP * x1 + DP * DP * nP * x2;
            const double sum = (-(pE - pW) * 2.0 * A1 + DP * nP * t0 * (t1 - t2 + t3 - t4)) * Dx +
                               G * (pE - 2.0 * pC + pW) + cross * (t1 - t2 - t3 + t4) +
                               Dy * A1 * (t1 + t2 - t3 - t4);
            const double q = 1.0 - nP;
            const double dbv = -2.0 * G + (porous ? alpha * q * q * q : 0.0);
            da[r] = static_cast<float>(H1 + G);
            db[r] = static_cast<float>(dbv);
            dc[r] = static_cast<float>(G - H1);
            dr[r] = static_cast<float>(sum);
        }
    };
    if (central)
        pass(std::true_type{});
    else
        pass(std::false_type{});
    // Faces without depth have no dispersion terms (a pass of its own, so
    // that the one above has no branch).
    for (int32_t r = 1; r < m; ++r)
        if (!(onDepth[r] > 0.0f)) da[r] = db[r] = dc[r] = dr[r] = 0.0f;
    if (gGeneration.numberOfRecords > 0) DispersionSourceRows(v, s, first, last, central, w);
    if (e.deepWaterTerms) DeepWaterRows(v, s, first, last, central, w);
}

BW_VECTOR_CLONES
void ContinuityRows(const AxisView& v, int32_t k, int32_t first, int32_t last, bool central,
                    const ChainRows& w, float* Bc, float* Rc) {
    const int32_t m = last - first + 1;
    const float* xi = v.xi;
    const size_t base = v.At(first, k);
    const double f4 = 4.0 * v.ds / gGrid.dt, ratio = static_cast<double>(v.ds) / v.dn;
    const bool gen = gGeneration.numberOfRecords > 0;
    const float* __restrict cw = w.c.data();
    const float* __restrict p = w.p.data();
    const float* __restrict qC = w.qC.data();
    const float* __restrict qS = w.qS.data();
    const float* __restrict qCo = w.qCo.data();
    const float* __restrict qSo = w.qSo.data();
    const float* __restrict por = w.por.data();
    const float* __restrict xiC = xi + base - 1;  // xiC[r] is xi at point first + r - 1
    // Every point without its source, in a pass that vectorises; cP and cQ
    // stay as the zeros they are there, so that a -0 sum becomes +0 alike.
#pragma GCC ivdep
    for (int32_t r = 1; r <= m; ++r) {
        const double c = cw[r], cc1 = c / (2.0 - c);
        const double bc = (central ? cc1 : c) * f4 * por[r];
        const float bcs = static_cast<float>(bc);
        Bc[r] = bcs;
        Rc[r] = static_cast<float>(static_cast<double>(bcs) * xiC[r] -
                                   (static_cast<double>(p[r]) - p[r - 1]) * cc1 + 0.0 -
                                   ((static_cast<double>(qC[r]) - qS[r]) +
                                    cc1 * (static_cast<double>(qCo[r]) - qSo[r]) - 0.0) *
                                       ratio);
    }
    if (!gen) return;
    // The points of generation lines once more, with their sources.
    for (int32_t r = 1; r <= m; ++r) {
        const int32_t i = w.src[r];
        if (i < 1) continue;
        const double c = w.c[r], cc1 = c / (2.0 - c);
        const double cP = v.sF[i] + v.sFPrev[i] * cc1;
        const double cQ = v.sG[i] + v.sGPrev[i] * cc1;
        const double bc = (central ? cc1 : c) * f4 * w.por[r];
        const float bcs = static_cast<float>(bc);
        Bc[r] = bcs;
        Rc[r] = static_cast<float>(static_cast<double>(bcs) * xi[base + r - 1] -
                                   (static_cast<double>(w.p[r]) - w.p[r - 1]) * cc1 + cP -
                                   ((static_cast<double>(w.qC[r]) - w.qS[r]) +
                                    cc1 * (static_cast<double>(w.qCo[r]) - w.qSo[r]) - cQ) *
                                       ratio);
    }
}
