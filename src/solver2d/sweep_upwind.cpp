// The sweeps with upwind forms of convection. The rows are those of the
// central sweeps, but convection in x enters the momentum rows implicitly
// with the weights of the chosen scheme over up to five fluxes, and
// convection in y explicitly from the old fluxes of the neighbouring lines.
// Lines depend only on old levels, so they are solved in parallel. With the
// central or first-order weights the fluxes P(j-1), P(j+1) of a momentum row
// are eliminated by the continuity rows and the chain is one tridiagonal
// system over (P(first-1), xi(first), P(first), ..., xi(last), P(last));
// the third-order weights reach P(j-2) and P(j+2), and that system goes to a
// banded factorisation with partial pivoting.
#include <omp.h>

#include <algorithm>
#include <cmath>
#include <cstdlib>

#include "processes/internal_generation.hpp"
#include "processes/porosity.hpp"
#include "solver2d/sweep_rows.hpp"
#include "solver2d/sweeps.hpp"
#include "solver2d/time_loop.hpp"

extern "C" {
void sgbtrf_(const int* m, const int* n, const int* kl, const int* ku, float* ab, const int* ldab,
             int* ipiv, int* info);
void sgbtrs_(const char* trans, const int* n, const int* kl, const int* ku, const int* nrhs,
             const float* ab, const int* ldab, const int* ipiv, float* b, const int* ldb, int* info,
             size_t transLength);
}

namespace {

struct Weights {
    double c1, c2, c3;  // downwind, upwind, beyond upwind
};

Weights SchemeWeights(int32_t handle) {
    switch (std::abs(handle)) {
        case 2: return {0.375, 0.75, -0.125};
        case 3: return {0.0, 1.0, 0.0};
        default: return {0.5, 0.5, 0.0};
    }
}

// Adds the implicit convection in x and the explicit convection in y of the
// faces of a chain to the rows aa..cc and r (face q at index first + q - 1).
BW_VECTOR_CLONES
void ConvectionTerms(const AxisView& v, int32_t k, int32_t first, int32_t last, const ChainRows& w,
                     const double* uE, const double* uW, const double* vN, const double* vS,
                     float* aa, float* a, float* b, float* c, float* cc, float* r) {
    const int32_t h = gEquation.convectiveHandle;
    const Weights scheme = SchemeWeights(h);
    const bool limit = h > 0;
    const bool gen = gGeneration.numberOfRecords > 0;
    const double dx = v.ds, dy = v.dn;
    const int32_t m = last - first + 1;
    const size_t up = v.across;
    const float* PPrev = v.FPrev;
    for (int32_t q = 1; q < m; ++q) {
        const int32_t j = first + q - 1;
        const size_t pt = v.At(j, k);
        double co[5] = {0, 0, 0, 0, 0};  // on P(j-2) .. P(j+2)
        bool nearSource = false;
        if (gen)
            for (int32_t i = j - 1; i <= j + 2; ++i)
                if (i >= 0 && i <= v.n && v.source[v.At(i, k)] >= 1) nearSource = true;
        if (nearSource) {
            co[1] -= uW[q] / (2.0 * dx);
            co[2] += (uE[q] - uW[q]) / (2.0 * dx);
            co[3] += uE[q] / (2.0 * dx);
        } else {
            const int32_t jm = std::max(j - 1, 0), jp = std::min(j + 2, v.n);
            const bool inner = v.codeE[v.At(jm, k)] == 4 && v.codeE[pt] == 4 &&
                               v.codeE[pt + v.along] == 4 && v.codeE[v.At(jp, k)] == 4;
            Weights wt = inner ? scheme : Weights{0.0, 1.0, 0.0};
            if (inner && limit) {
                const double d2 = std::fabs(static_cast<double>(w.p[q + 1]) - 2.0 * w.p[q] + w.p[q - 1]);
                const double d1 = std::fabs(static_cast<double>(w.p[q + 1]) - w.p[q - 1]);
                if (!(d2 <= d1)) wt = {0.0, 1.0, 0.0};
            }
            // Face value = c2*U + c1*Dn + c3*UU, offsets from j into co[2 + offset].
            auto add = [&](double speed, int32_t U, int32_t Dn, int32_t UU, double sign) {
                co[2 + U] += sign * speed * wt.c2 / dx;
                co[2 + Dn] += sign * speed * wt.c1 / dx;
                co[2 + UU] += sign * speed * wt.c3 / dx;
            };
            if (uE[q] > 0.0) add(uE[q], 0, 1, -1, 1.0); else add(uE[q], 1, 0, 2, 1.0);
            if (uW[q] > 0.0) add(uW[q], -1, 0, -2, -1.0); else add(uW[q], 0, -1, 1, -1.0);
        }
        aa[j] += static_cast<float>(co[0]);
        a[j] += static_cast<float>(co[1]);
        b[j] += static_cast<float>(co[2]);
        c[j] += static_cast<float>(co[3]);
        cc[j] += static_cast<float>(co[4]);

        // Convection across the line, explicit.
        const size_t pe = pt + v.along;
        const bool inner = v.codeN[pt] == 4 && v.codeN[pt + up] == 4 && v.codeN[pt - up] == 4 &&
                           v.codeN[pe] == 4 && v.codeN[pe + up] == 4 && v.codeN[pe - up] == 4;
        double north, south;
        if (inner) {
            auto column = [&](int32_t kk) {
                kk = std::min(std::max(kk, 0), v.lines);
                return static_cast<double>(PPrev[v.At(j, kk)]);
            };
            Weights wt = scheme;
            if (limit) {
                const double d2 = std::fabs(column(k + 1) - 2.0 * column(k) + column(k - 1));
                const double d1 = std::fabs(column(k + 1) - column(k - 1));
                if (!(d2 <= d1)) wt = {0.0, 1.0, 0.0};
            }
            north = vN[q] > 0.0 ? wt.c2 * column(k) + wt.c1 * column(k + 1) + wt.c3 * column(k - 1)
                                : wt.c2 * column(k + 1) + wt.c1 * column(k) + wt.c3 * column(k + 2);
            south = vS[q] > 0.0 ? wt.c2 * column(k - 1) + wt.c1 * column(k) + wt.c3 * column(k - 2)
                                : wt.c2 * column(k) + wt.c1 * column(k - 1) + wt.c3 * column(k + 1);
        } else {
            north = vN[q] > 0.0 ? w.p[q] : w.pN[q];
            south = vS[q] > 0.0 ? w.pS[q] : w.p[q];
        }
        r[j] -= static_cast<float>((vN[q] * north - vS[q] * south) / dy);
    }
}

BW_VECTOR_CLONES
void AssembleLine(const AxisView& v, const SweepConstants& s, int32_t k, int32_t flag,
                  ChainRows& w) {
    SweepBuffers& sb = gSweepBuffers;
    float* e = sb.Row(kBufE, k, v.n);
    float* b = sb.Row(kBufB, k, v.n);
    float* f = sb.Row(kBufF, k, v.n);
    float* r = sb.Row(kBufR, k, v.n);
    float* aa = sb.Row(kBufAA, k, v.n);
    float* a = sb.Row(kBufA, k, v.n);
    float* c = sb.Row(kBufC, k, v.n);
    float* cc = sb.Row(kBufCC, k, v.n);
    float* Bc = sb.Row(kBufBc, k, v.n);
    float* Rc = sb.Row(kBufRc, k, v.n);
    const double dt = s.dt, g = s.g, dx = s.dx;
    const double cor = v.coriolisSign * s.fc;
    const double alpha = gPorosity.alpha, beta = gPorosity.beta;
    const int32_t count = (*v.chainCount)[k];
    for (int32_t ch = 0; ch < count; ++ch) {
        const int32_t first = v.Chain(k, ch).first, last = v.Chain(k, ch).last;
        CheckChainDepth(v, k, first, last);
        LoadChainRows(v, k, first, last, false, w);
        FrictionRows(v, k, first, last, w);
        RollerRows(v, k, first, last, w);
        EddyRows(v, k, first, last, flag, w);
        DispersionRows(v, s, k, first, last, false, w);
        const int32_t m = last - first + 1;
        double *pE = w.uE.data(), *pW = w.uW.data(), *pN = w.vN.data(), *pS = w.vS.data();
        for (int32_t q = 1; q < m; ++q) {
            const double fac = w.fac[q];
            pE[q] = fac * (static_cast<double>(w.p[q + 1]) + w.p[q]) * 0.5 / w.dE[q + 1];
            pW[q] = fac * (static_cast<double>(w.p[q]) + w.p[q - 1]) * 0.5 / w.dE[q];
            pN[q] = fac * 2.0 * (static_cast<double>(w.qC[q]) + w.qC[q + 1]) /
                    (static_cast<double>(w.dEN[q]) + w.dE[q] + w.dE[q + 1] + w.dEN[q + 1]);
            pS[q] = fac * 2.0 * (static_cast<double>(w.qS[q]) + w.qS[q + 1]) /
                    (static_cast<double>(w.dE[q]) + w.dE[q + 1] + w.dES[q] + w.dES[q + 1]);
            const int32_t j = first + q - 1;
            const double nP = w.nP[q], dP = w.dP[q];
            const double bb = nP / dt;
            b[j] = static_cast<float>(bb);
            r[j] = static_cast<float>(w.p[q] * bb + (pN[q] + pS[q]) * cor * dP * nP);
            f[j] = static_cast<float>(dP * (g / dx) * nP * nP);
            e[j] = -f[j];
            aa[j] = a[j] = c[j] = cc[j] = 0.0f;
        }
        ConvectionTerms(v, k, first, last, w, pE, pW, pN, pS, aa, a, b, c, cc, r);
        for (int32_t q = 1; q < m; ++q) {
            const int32_t j = first + q - 1;
            const double nP = w.nP[q], U = w.U[q], Fr = w.Fr[q];
            double add = U * Fr;
            if (1.0 - nP >= 0.0001)
                add += alpha * (1.0 - nP) * (1.0 - nP) * (1.0 - nP) + ((1.0 - nP) * beta / w.dP[q] / nP) * U;
            b[j] += static_cast<float>(add) + w.m2[q] + w.db[q];
            r[j] += w.rr[q] + w.m4[q] + w.dr[q];
            a[j] += w.m1[q] + w.da[q];
            c[j] += w.m3[q] + w.dc[q];
        }
        ContinuityRows(v, k, first, last, false, w, Bc + first - 1, Rc + first - 1);
    }
}

// Stores the solution x(1..N) of a chain: surface and flux, and the flux
// west of the chain.
void StoreChain(const AxisView& v, int32_t k, int32_t first, int32_t last, const float* x) {
    float* xi = v.xi;
    for (int32_t j = first; j <= last; ++j) {
        const size_t pt = v.At(j, k);
        xi[pt] = x[2 * (j - first) + 2];
        v.F[pt] = x[2 * (j - first) + 3];
    }
    if (first == 0)
        v.FEdge[k] = x[1];
    else
        v.F[v.At(first - 1, k)] = x[1];
}

void SolveTridiagonal(const AxisView& v, int32_t k, int32_t first, int32_t last, float* work) {
    SweepBuffers& sb = gSweepBuffers;
    float* e = sb.Row(kBufE, k, v.n);
    float* b = sb.Row(kBufB, k, v.n);
    float* f = sb.Row(kBufF, k, v.n);
    float* r = sb.Row(kBufR, k, v.n);
    const float* a = sb.Row(kBufA, k, v.n);
    const float* c = sb.Row(kBufC, k, v.n);
    const float* Bc = sb.Row(kBufBc, k, v.n);
    const float* Rc = sb.Row(kBufRc, k, v.n);
    for (int32_t j = first; j < last; ++j) {
        e[j] += Bc[j] * a[j];
        f[j] -= Bc[j + 1] * c[j];
        r[j] += a[j] * Rc[j] - c[j] * Rc[j + 1];
        b[j] += a[j] + c[j];
    }
    const int32_t N = 2 * (last - first) + 3;
    float* lo = work;
    float* di = lo + N + 1;
    float* upr = di + N + 1;
    float* rh = upr + N + 1;
    float* G = rh + N + 1;
    float* H = G + N + 1;
    float* x = H + N + 1;
    lo[1] = 0.0f, di[1] = 1.0f, upr[1] = 0.0f, rh[1] = 0.0f;
    for (int32_t j = first; j <= last; ++j) {
        const int32_t i = 2 * (j - first) + 2;
        lo[i] = -1.0f, di[i] = Bc[j], upr[i] = 1.0f, rh[i] = Rc[j];
        if (j < last) lo[i + 1] = e[j], di[i + 1] = b[j], upr[i + 1] = f[j], rh[i + 1] = r[j];
    }
    lo[N] = 0.0f, di[N] = 1.0f, upr[N] = 0.0f, rh[N] = 0.0f;
    G[N] = -lo[N] / di[N];
    H[N] = rh[N] / di[N];
    for (int32_t i = N - 1; i >= 2; --i) {
        const float w = 1.0f / (G[i + 1] * upr[i] + di[i]);
        H[i] = (rh[i] - upr[i] * H[i + 1]) * w;
        G[i] = -lo[i] * w;
    }
    x[1] = (rh[1] - H[2] * upr[1]) / (G[2] * upr[1] + di[1]);
    for (int32_t i = 2; i <= N; ++i) x[i] = G[i] * x[i - 1] + H[i];
    StoreChain(v, k, first, last, x);
}

void SolveBanded(const AxisView& v, int32_t k, int32_t first, int32_t last, int thread) {
    SweepBuffers& sb = gSweepBuffers;
    const float* e = sb.Row(kBufE, k, v.n);
    const float* b = sb.Row(kBufB, k, v.n);
    const float* f = sb.Row(kBufF, k, v.n);
    const float* r = sb.Row(kBufR, k, v.n);
    const float* aa = sb.Row(kBufAA, k, v.n);
    const float* a = sb.Row(kBufA, k, v.n);
    const float* c = sb.Row(kBufC, k, v.n);
    const float* cc = sb.Row(kBufCC, k, v.n);
    const float* Bc = sb.Row(kBufBc, k, v.n);
    const float* Rc = sb.Row(kBufRc, k, v.n);
    const int N = 2 * (last - first) + 3, kl = 4, ku = 4, ldab = 13, one = 1;
    const size_t rows = 2 * sb.lineLength + 3;
    float* ab = sb.band.data() + static_cast<size_t>(thread) * 13 * rows;
    float* rhs = sb.rhs.data() + static_cast<size_t>(thread) * rows;
    int* ipiv = sb.pivots.data() + static_cast<size_t>(thread) * rows;
    std::fill(ab, ab + static_cast<size_t>(ldab) * N, 0.0f);
    // A(i, col), 1-based, in the band storage of the factorisation.
    auto set = [&](int i, int col, float value) {
        if (col < 1 || col > N) return;
        ab[(kl + ku + i - col) + static_cast<size_t>(col - 1) * ldab] = value;
    };
    set(1, 1, 1.0f);
    rhs[0] = 0.0f;
    for (int32_t j = first; j <= last; ++j) {
        const int i = 2 * (j - first) + 2;
        set(i, i - 1, -1.0f);
        set(i, i, Bc[j]);
        set(i, i + 1, 1.0f);
        rhs[i - 1] = Rc[j];
        if (j == last) break;
        const int m = i + 1;  // the momentum row of face j: P(j) is x(m)
        set(m, m - 4, aa[j]);
        set(m, m - 2, a[j]);
        set(m, m - 1, e[j]);
        set(m, m, b[j]);
        set(m, m + 1, f[j]);
        set(m, m + 2, c[j]);
        set(m, m + 4, cc[j]);
        rhs[m - 1] = r[j];
    }
    set(N, N, 1.0f);
    rhs[N - 1] = 0.0f;
    int info = 0;
    sgbtrf_(&N, &N, &kl, &ku, ab, &ldab, ipiv, &info);
    if (info == 0) sgbtrs_("N", &N, &kl, &ku, &one, ab, &ldab, ipiv, rhs, &N, &info, 1);
    if (info != 0) {
        const int32_t j = first + (info - 1) / 2;
        BlowUp("Negative water depth, near (%,%)", v.axis == 1 ? j : k, v.axis == 1 ? k : j);
    }
    StoreChain(v, k, first, last, rhs - 1);
}

void SolveLine(const AxisView& v, int32_t k, int thread) {
    if (k == 0 || k == v.lines) return;
    const int32_t count = (*v.chainCount)[k];
    const bool banded = std::abs(gEquation.convectiveHandle) == 2;
    ChainRows& w = gSweepBuffers.rows[thread];
    for (int32_t ch = 0; ch < count; ++ch) {
        const int32_t first = v.Chain(k, ch).first, last = v.Chain(k, ch).last;
        if (banded)
            SolveBanded(v, k, first, last, thread);
        else
            SolveTridiagonal(v, k, first, last, w.solve.data());
    }
}

void SweepUpwindOn(int32_t axis, bool lineOrderFlag);

void SweepUpwind(int32_t axis, bool lineOrderFlag) {
    if (axis == 2) CopyColumnsIn();
    SweepUpwindOn(axis, lineOrderFlag);
    if (axis == 2) CopyColumnsOut();
}

void SweepUpwindOn(int32_t axis, bool lineOrderFlag) {
    const AxisView v = MakeAxisView(axis);
    const SweepConstants s = MakeSweepConstants(v);
    const int32_t flag = lineOrderFlag ? 1 : 0;
    const int32_t lines = v.lines;
    float* F = v.F;
    float* FPrev = v.FPrev;
    float* FDiff = v.FDiff;
    const size_t points = gGrid.Points();
#pragma omp parallel for schedule(static)
    for (size_t p = 0; p < points; ++p) {
        FDiff[p] = F[p] - FPrev[p];
        FPrev[p] = F[p];
    }
    auto line = [&](int32_t i) { return flag ? lines - i : i; };
    if (gLoop.sweepMode == 1) {
#pragma omp parallel for schedule(static)
        for (int32_t i = 0; i <= lines; ++i) {
            const int32_t k = line(i);
            if (k == 0 || k == lines) continue;
            const int t = omp_get_thread_num();
            AssembleLine(v, s, k, flag, gSweepBuffers.rows[t]);
            SolveLine(v, k, t);
        }
        return;
    }
#pragma omp parallel for schedule(static)
    for (int32_t i = 0; i <= lines; ++i) {
        const int32_t k = line(i);
        if (k != 0 && k != lines) AssembleLine(v, s, k, flag, gSweepBuffers.rows[omp_get_thread_num()]);
    }
    for (int32_t i = 0; i <= lines; ++i) SolveLine(v, line(i), 0);
}

}  // namespace

void XSweep_New(bool lineOrderFlag, int32_t /*step*/) { SweepUpwind(1, lineOrderFlag); }
void YSweep_New(bool lineOrderFlag, int32_t /*step*/) { SweepUpwind(2, lineOrderFlag); }
