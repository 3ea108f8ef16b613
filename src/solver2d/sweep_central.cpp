// The central sweeps with side-feeding. Along each chain of a line the
// momentum rows of the faces and the continuity rows of the points form one
// system for the new surface and flux:
//
//   continuity at point j:  P(j) - P(j-1) + Bc(j) xi(j) = Rc(j)
//   momentum at face j:     e(j) xi(j) + b(j) P(j) + f(j) xi(j+1) = r(j)
//
// where the momentum row already has P(j-1) and P(j+1) eliminated by the
// continuity rows. Convection is centred in space and time: in x implicit,
// in y through the neighbouring lines, whose new fluxes are fed in at the
// moment a line is solved (side-feeding), so that lines are solved one after
// the other, in an order that turns at every step. The system is solved by a
// double sweep: from east to west a recursion xi(j+1) = A(j) P(j) + C(j),
// P(j) = E(j) xi(j) + F(j); from west to east the values.
#include <omp.h>

#include <cmath>

#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/internal_generation.hpp"
#include "solver2d/chains.hpp"
#include "solver2d/sweep_rows.hpp"
#include "solver2d/sweeps.hpp"
#include "solver2d/time_loop.hpp"

namespace {

// Grid numbers (j,k) of position i along line l.
inline int32_t GridJ(const AxisView& v, int32_t i, int32_t l) { return v.axis == 1 ? i : l; }
inline int32_t GridK(const AxisView& v, int32_t i, int32_t l) { return v.axis == 1 ? l : i; }

int32_t TableRow(int32_t b, int32_t j, int32_t k) {
    const BoundaryRecord& r = Boundary(b);
    return (r.orientation == 1 || r.orientation == 3) ? k - r.first[1] : j - r.first[0];
}

void SweepCentralOn(int32_t axis, bool lineOrderFlag);

BW_VECTOR_CLONES
void AssembleLineCentral(const AxisView& v, const SweepConstants& s, int32_t k, int32_t flag,
                         ChainRows& w) {
    SweepBuffers& sb = gSweepBuffers;
    float* e = sb.Row(kBufE, k, v.n);
    float* b = sb.Row(kBufB, k, v.n);
    float* f = sb.Row(kBufF, k, v.n);
    float* r = sb.Row(kBufR, k, v.n);
    float* sN = sb.Row(kBufSideN, k, v.n);
    float* sS = sb.Row(kBufSideS, k, v.n);
    float* Bc = sb.Row(kBufBc, k, v.n);
    float* Rc = sb.Row(kBufRc, k, v.n);
    const double dt = s.dt, dx = s.dx, dy = s.dy, g = s.g;
    const double cor = v.coriolisSign * 2.0 * s.fc;
    const double w1 = 1 - flag, w2 = flag;
    const double beta = gPorosity.beta;
    const int32_t count = (*v.chainCount)[k];
    for (int32_t c = 0; c < count; ++c) {
        const int32_t first = v.Chain(k, c).first, last = v.Chain(k, c).last;
        CheckChainDepth(v, k, first, last);
        if (v.codeN[v.At(last, k)] >= kCodeLevelBoundary) continue;  // a boundary row
        LoadChainRows(v, k, first, last, true, w);
        FrictionRows(v, k, first, last, w);
        RollerRows(v, k, first, last, w);
        EddyRows(v, k, first, last, flag, w);
        DispersionRows(v, s, k, first, last, true, w);
        const int32_t m = last - first + 1;
        float* BcC = Bc + first - 1;  // BcC[r] is Bc at point first + r - 1
        float* RcC = Rc + first - 1;
        ContinuityRows(v, k, first, last, true, w, BcC, RcC);
        // Reciprocals once a point and once a sweep; the face loop multiplies.
        double* __restrict inv = w.uE.data();
        for (int32_t q = 1; q <= m; ++q) inv[q] = 1.0 / w.dE[q];
        const double quarter = 0.25 / dx, idt = 1.0 / dt, idy = 1.0 / dy, gdx = g / dx;
        const float* __restrict pr = w.p.data();
        const float* __restrict qC = w.qC.data();
        const float* __restrict qS = w.qS.data();
        const float* __restrict dEN = w.dEN.data();
        const float* __restrict dES = w.dES.data();
        const float* __restrict fac = w.fac.data();
        const float* __restrict nPr = w.nP.data();
        const float* __restrict dPr = w.dP.data();
        const float* __restrict U = w.U.data();
        const float* __restrict Fr = w.Fr.data();
        const float* __restrict da = w.da.data();
        const float* __restrict db = w.db.data();
        const float* __restrict dc = w.dc.data();
        const float* __restrict dr = w.dr.data();
        const float* __restrict m1 = w.m1.data();
        const float* __restrict m2 = w.m2.data();
        const float* __restrict m3 = w.m3.data();
        const float* __restrict m4 = w.m4.data();
        const float* __restrict rr = w.rr.data();
        float* __restrict eC = e + first - 1;  // index q is the face first + q - 1
        float* __restrict bC = b + first - 1;
        float* __restrict fC = f + first - 1;
        float* __restrict rC = r + first - 1;
        float* __restrict sNC = sN + first - 1;
        float* __restrict sSC = sS + first - 1;
#pragma GCC ivdep
        for (int32_t q = 1; q < m; ++q) {
            const double fc = fac[q], nP = nPr[q], dP = dPr[q], p = pr[q];
            const double uW2 = fc * quarter * (p + pr[q - 1]) * inv[q];
            const double uE2 = fc * quarter * (p + pr[q + 1]) * inv[q + 1];
            const double vN2 = fc * (static_cast<double>(qC[q]) + qC[q + 1]) /
                               (static_cast<double>(dEN[q]) + 2.0 * dP + dEN[q + 1]);
            const double vS2 = fc * (static_cast<double>(qS[q]) + qS[q + 1]) /
                               (static_cast<double>(dES[q]) + 2.0 * dP + dES[q + 1]);
            const double open = 1.0 - nP;
            const double por = open >= 0.0001 ? beta * open / (dP * nP) : 0.0;
            const double ro = static_cast<double>(U[q]) * (Fr[q] + por);
            const double a = da[q] - uW2 + m1[q];
            const double cc = dc[q] + uE2 + m3[q];
            const double f0 = dP * gdx * nP * nP;
            const double bc0 = BcC[q], bc1 = BcC[q + 1];
            eC[q] = static_cast<float>(bc0 * a - f0);
            fC[q] = static_cast<float>(f0 - bc1 * cc);
            bC[q] = static_cast<float>(nP * idt - uW2 + uE2 + (vN2 * w1 - vS2 * w2) * idy + ro + a + cc +
                                       db[q] + m2[q]);
            rC[q] = static_cast<float>(p * nP * idt + (vN2 + vS2) * cor * dP * nP -
                                       (vN2 * w2 - vS2 * w1) * p * idy + a * RcC[q] - cc * RcC[q + 1] +
                                       m4[q] + rr[q] + dr[q]);
            sNC[q] = static_cast<float>(-vN2 * idy);
            sSC[q] = static_cast<float>(vS2 * idy);
        }
    }
}

// A chain that lies along a boundary running with the line takes the
// boundary's level, or keeps its surface under a flux boundary.
void BoundaryRow(const AxisView& v, int32_t k, int32_t first, int32_t last) {
    const int32_t gj = GridJ(v, first, k), gk = GridK(v, first, k);
    const int32_t b = FindBoundary(gj, gk, 3 - v.endAxis);
    if (b == 0) BlowUp("Unexpected boundary type/orientation, near (%,%)", gj, gk);
    const int32_t o = Boundary(b).orientation;
    const bool along = v.axis == 1 ? (o == 2 || o == 4) : (o == 1 || o == 3);
    if (!along) BlowUp("Undetected open point, near (%,%)", gj, gk);
    if (v.codeN[v.At(last, k)] != kCodeLevelBoundary) return;
    const BoundaryTable& t = BoundaryValues(b);
    float* xi = v.xi;
    for (int32_t i = first; i <= last; ++i)
        xi[v.At(i, k)] = t.Value(TableRow(b, GridJ(v, i, k), GridK(v, i, k)), v.levelColumn);
}

// The boundary of a mark at a chain's end, with the checks of the sweep.
int32_t EndRecord(const AxisView& v, int32_t i, int32_t k) {
    const int32_t b = FindBoundary(GridJ(v, i, k), GridK(v, i, k), v.endAxis);
    if (b == 0) BlowUp("Undefined open boundary point, near (%,%)", GridJ(v, i, k), GridK(v, i, k));
    return b;
}

void SolveChainCentral(const AxisView& v, const SweepConstants& s, int32_t k, int32_t first,
                       int32_t last) {
    SweepBuffers& sb = gSweepBuffers;
    const float* e = sb.Row(kBufE, k, v.n);
    const float* b = sb.Row(kBufB, k, v.n);
    const float* f = sb.Row(kBufF, k, v.n);
    const float* r = sb.Row(kBufR, k, v.n);
    const float* Bc = sb.Row(kBufBc, k, v.n);
    const float* Rc = sb.Row(kBufRc, k, v.n);
    float* A = sb.A.data() + 1;  // index -1 is the face west of j = 0
    float* C = sb.C.data() + 1;
    float* E = sb.E.data() + 1;
    float* F = sb.F.data() + 1;
    float* xi = v.xi;
    const size_t up = v.across;
    const int32_t west = v.codeE[v.At(first, k)], east = v.codeE[v.At(last, k)];
    const int32_t gj = GridJ(v, last, k), gk = GridK(v, last, k);

    if (first == last && west != kCodeLevelBoundary) {
        if (west == kCodeFluxBoundary)
            BlowUp("One point wide open flux boundary, near (%,%)", gj, gk);
        // A point with no flux of its own: its surface follows from the flux across.
        const size_t pt = v.At(first, k);
        const int32_t i = v.source != nullptr ? v.source[pt] : 0;
        const double src = i >= 1 ? static_cast<double>(v.sG[i]) + v.sGPrev[i] : 0.0;
        xi[pt] -= static_cast<float>(((v.G[pt] - src - v.G[pt - up] + v.GPrev[pt] - v.GPrev[pt - up]) *
                                      (s.dt / (4.0 * s.dy))) /
                                     v.porosity[pt]);
        return;
    }

    // The east end starts the recursion.
    int32_t start;
    float eastFlux = 0.0f;
    if (east == 3) {
        E[last] = 0.0f;
        F[last] = 0.0f;
        const float w = 1.0f / Bc[last];
        A[last - 1] = w;
        C[last - 1] = w * Rc[last];
        start = last - 1;
    } else if (east == kCodeFluxBoundary) {
        const int32_t bn = EndRecord(v, last, k);
        eastFlux = BoundaryValues(bn).Value(TableRow(bn, gj, gk), v.fluxColumn);
        E[last - 1] = 0.0f;
        F[last - 1] = eastFlux;
        A[last - 1] = 0.0f;
        C[last - 1] = 0.0f;
        const float w = 1.0f / Bc[last - 1];
        A[last - 2] = w;
        C[last - 2] = w * (Rc[last - 1] - eastFlux);
        start = last - 2;
    } else if (east == kCodeLevelBoundary) {
        const int32_t bn = EndRecord(v, last, k);
        const BoundaryRecord& rec = Boundary(bn);
        if (rec.formulation != 0 || rec.orientation != (v.axis == 1 ? 3 : 2))
            BlowUp("Unexpected boundary type/orientation, near (%,%)", gj, gk);
        const float level = BoundaryValues(bn).Value(TableRow(bn, gj, gk), v.levelColumn);
        if (first == last) {
            xi[v.At(last, k)] = level;
            return;
        }
        A[last - 1] = 0.0f;
        C[last - 1] = level;
        start = last - 1;
    } else {
        BlowUp("Undetected open east or north boundary point, near (%,%)", gj, gk);
    }
    if (west > 4 && west != kCodeLevelBoundary && west != kCodeFluxBoundary)
        BlowUp("Undetected open west or north boundary point, near (%,%)", GridJ(v, first, k),
               GridK(v, first, k));
    const int32_t stop = west == kCodeFluxBoundary ? first + 1 : first;
    for (int32_t j = start; j >= stop; --j) {
        const float den = A[j] * f[j] + b[j];
        F[j] = (r[j] - f[j] * C[j]) / den;
        E[j] = -e[j] / den;
        const float w = 1.0f / (Bc[j] + E[j]);
        A[j - 1] = w;
        C[j - 1] = w * (Rc[j] - F[j]);
    }

    // The forward pass from the west end.
    float* P = v.F;
    float* PPrev = v.FPrev;
    float* pxyt = v.FDiff;
    float x;
    int32_t from;
    if (west == kCodeLevelBoundary) {
        const int32_t bn = EndRecord(v, first, k);
        x = BoundaryValues(bn).Value(TableRow(bn, GridJ(v, first, k), GridK(v, first, k)), v.levelColumn);
        xi[v.At(first, k)] = x;
        from = first;
    } else if (west == kCodeFluxBoundary) {
        const int32_t bn = EndRecord(v, first, k);
        E[first] = 0.0f;
        F[first] = BoundaryValues(bn).Value(TableRow(bn, GridJ(v, first, k), GridK(v, first, k)),
                                            v.fluxColumn);
        x = xi[v.At(first, k)];
        from = first;
    } else {
        x = C[first - 1];  // the flux west of the chain is 0
        xi[v.At(first, k)] = x;
        from = first;
    }
    for (int32_t j = from; j < last; ++j) {
        const size_t pt = v.At(j, k);
        const float newP = E[j] * x + F[j];
        pxyt[pt] = P[pt] - PPrev[pt];
        PPrev[pt] = P[pt];
        P[pt] = newP;
        x = A[j] * newP + C[j];
        xi[pt + v.along] = x;
    }

    // End stores.
    const size_t pl = v.At(last, k), pf = v.At(first, k);
    if (east == kCodeLevelBoundary) {
        pxyt[pl] = P[pl] - PPrev[pl];
        PPrev[pl] = P[pl];
        P[pl] = P[pl - v.along] + Rc[last] - Bc[last] * xi[pl];
    } else if (east == kCodeFluxBoundary) {
        xi[pl] = xi[pl - v.along];
    }
    if (west == kCodeLevelBoundary) {
        if (first == 0) {
            v.FEdge[k] = P[pf] - Rc[first] + Bc[first] * xi[pf];
        } else {
            const size_t pw = pf - v.along;
            pxyt[pw] = P[pw] - PPrev[pw];
            PPrev[pw] = P[pw];
            P[pw] = P[pf] - Rc[first] + Bc[first] * xi[pf];
        }
    } else if (west == kCodeFluxBoundary) {
        xi[pf] = xi[pf + v.along];
    }
}

void SolveLineCentral(const AxisView& v, const SweepConstants& s, int32_t k) {
    const int32_t count = (*v.chainCount)[k];
    const bool edge = k == 0 || k == v.lines;
    if (!edge) {
        // Side-feeding: the neighbouring lines' present fluxes.
        float* r = gSweepBuffers.Row(kBufR, k, v.n);
        const float* sN = gSweepBuffers.Row(kBufSideN, k, v.n);
        const float* sS = gSweepBuffers.Row(kBufSideS, k, v.n);
        const float* P = v.F;
        const size_t up = v.across;
        for (int32_t c = count - 1; c >= 0; --c) {
            const int32_t first = v.Chain(k, c).first, last = v.Chain(k, c).last;
            if (v.codeN[v.At(last, k)] >= kCodeLevelBoundary) continue;
            // Faces j < last < n: the point beyond always exists. Bitwise
            // tests and selects, so that the pass vectorises.
            const size_t o = v.At(0, k);
            const int32_t* __restrict code = v.codeN + o;
            const float* __restrict Pc = P + o;
#pragma GCC ivdep
            for (int32_t j = first; j < last; ++j) {
                const int32_t c0 = code[j], c1 = code[j + 1];
                const bool nOk = ((c0 == 4) | (c0 == 2)) & ((c1 == 4) | (c1 == 2));
                const bool sOk = ((c0 == 4) | (c0 == 3)) & ((c1 == 4) | (c1 == 3));
                const float pc = Pc[j], pn = Pc[j + up], ps = Pc[j - up];
                const float PN = nOk ? pn : pc;
                const float PS = sOk ? ps : pc;
                r[j] += sN[j] * PN + sS[j] * PS;
            }
        }
    }
    for (int32_t c = count - 1; c >= 0; --c) {
        const int32_t first = v.Chain(k, c).first, last = v.Chain(k, c).last;
        if (v.codeN[v.At(last, k)] >= kCodeLevelBoundary)
            BoundaryRow(v, k, first, last);
        else if (!edge)
            SolveChainCentral(v, s, k, first, last);
    }
}

void SweepCentral(int32_t axis, bool lineOrderFlag) {
    if (axis == 2) CopyColumnsIn();
    SweepCentralOn(axis, lineOrderFlag);
    if (axis == 2) CopyColumnsOut();
}

void SweepCentralOn(int32_t axis, bool lineOrderFlag) {
    const AxisView v = MakeAxisView(axis);
    const SweepConstants s = MakeSweepConstants(v);
    const int32_t flag = lineOrderFlag ? 1 : 0;
    const int32_t lines = v.lines;
    auto line = [&](int32_t i) { return flag ? lines - i : i; };
    if (gLoop.sweepMode == 1) {
        ChainRows& w = gSweepBuffers.rows[0];
        for (int32_t i = 0; i <= lines; ++i) {
            const int32_t k = line(i);
            if (k != 0 && k != lines) AssembleLineCentral(v, s, k, flag, w);
            SolveLineCentral(v, s, k);
        }
        return;
    }
#pragma omp parallel for schedule(static)
    for (int32_t i = 0; i <= lines; ++i) {
        const int32_t k = line(i);
        if (k != 0 && k != lines)
            AssembleLineCentral(v, s, k, flag, gSweepBuffers.rows[omp_get_thread_num()]);
    }
    for (int32_t i = 0; i <= lines; ++i) SolveLineCentral(v, s, line(i));
}

}  // namespace

void XSweep(bool lineOrderFlag, int32_t /*step*/) { SweepCentral(1, lineOrderFlag); }
void YSweep(bool lineOrderFlag, int32_t /*step*/) { SweepCentral(2, lineOrderFlag); }
