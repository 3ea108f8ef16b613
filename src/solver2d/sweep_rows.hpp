// What the two sweep families share: a view of the grid along the sweep's
// own axis, the work rows of one chain, and the terms of the momentum and
// continuity rows that both assemble alike.
//
// The y-sweep is the x-sweep with x and y exchanged. The view holds that
// exchange once: "along" is the sweep's direction (x for the x-sweep), "line"
// the other index; F is the flux of the sweep (P), G the flux across (Q).
// Names follow the x-sweep: j runs along a line, k numbers the lines, N and
// S are the neighbouring lines k+1 and k-1.
//
// Work rows are indexed by r = j - first + 1, so that r = 0 is the point
// west of the chain and r = m + 1, m + 2 the points east of it (m points).
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "solver2d/model_state.hpp"

// The passes over a chain's rows are compiled twice on x86-64: for the
// processor every such machine has, and for one with 256-bit vectors, chosen
// when the program loads. Without contraction into fused multiply-adds the
// two give the same results to the last bit.
#if defined(__x86_64__) && defined(__GNUC__) && !defined(__clang__)
#define BW_VECTOR_CLONES __attribute__((target_clones("avx2", "default")))
#else
#define BW_VECTOR_CLONES
#endif

struct AxisView {
    int32_t axis = 1;           // 1: x-sweep, 2: y-sweep
    int32_t n = 0;              // highest index along a line (J)
    int32_t lines = 0;          // highest line index (K)
    size_t along = 1, across = 1;  // strides of the fields along a line and between lines
    float ds = 0.0f, dn = 0.0f;    // spacing along (dx) and across (dy)
    float *F, *FPrev, *FDiff;      // P, PPrev, pxyt
    float* FEdge;                  // PWest, one per line
    const float *G, *GPrev, *GDiff;  // Q, QPrev, qxyt
    const int32_t* codeN;  // codes across the line (codeX for the x-sweep)
    const int32_t* codeE;  // codes of the line's ends (codeY)
    const std::vector<int32_t>* chainCount;
    const std::vector<ChainPair>* chains;
    int32_t maxChains = 0;
    float* xiExt;
    const float* depthExt;
    double coriolisSign = 1.0;  // +fc in the x-sweep, -fc in the y-sweep
    int32_t levelColumn = 2, fluxColumn = 1, replaceColumn = 4, gradientColumn = 6;
    int32_t endAxis = 1;  // FindBoundary axis of the chain ends; the rows take the other
    // Source vectors of internal generation (index = source number).
    const float *sF, *sFPrev, *sG, *sGPrev, *sGPrev2, *sXiAlong, *sXiAcross;
    // The other fields a sweep reads, in the view's layout.
    float* xi;
    const float *bed, *porosity, *depth, *xiPrev;
    const float* friction;  // the map of the friction coefficient, or none
    const float* nu;        // eddy viscosity
    const float *delta, *cAlong, *cAcross;  // rollers
    const int32_t* source;  // sourceIndex, or none

    size_t At(int32_t j, int32_t k) const { return j * along + k * across; }
    const ChainPair& Chain(int32_t k, int32_t c) const {
        return (*chains)[static_cast<size_t>(k) * maxChains + c];
    }
};

// The view of the x-sweep (axis 1) or the y-sweep (axis 2) on the model.
// The y-sweep works on column-major copies of the fields (ColumnCopies), so
// that its lines, too, are contiguous.
AxisView MakeAxisView(int32_t axis);

// Column-major copies of the fields the y-sweep reads and writes: value
// (j,k) at j*(K+1) + k. The fields that never change after the chains are
// made are copied once (CopyStaticColumns); the others before each y-sweep
// (CopyColumnsIn), and those the y-sweep writes back after it (CopyColumnsOut).
struct ColumnCopies {
    Field bed, porosity, friction, nu;
    std::vector<int32_t> codeN, codeE, source;
    Field depth, xiPrev, xi, Q, QPrev, qxyt, P, PPrev, pxyt, xiExt, depthExt, delta, cx, cy;
};
extern ColumnCopies gColumns;
void CopyStaticColumns();
void CopyColumnsIn();
void CopyColumnsOut();

// The work rows of one chain, private to the thread that assembles it.
struct ChainRows {
    int32_t capacity = 0;
    // Point rows.
    std::vector<float> p, pN, pS, qC, qS, qCo, qSo, sE, sEN, sES, dE, dEN, dES, por, c, dpt;
    std::vector<float> D, gD, gDS;  // still water depth; old time differences of G at k, k-1
    std::vector<int32_t> src;  // source number of each point, 0 for none
    // Face rows.
    std::vector<float> nP, dP, DP, Dx, Dy, U, Fr, fac;
    // Results of the shared terms, per face.
    std::vector<float> da, db, dc, dr, m1, m2, m3, m4, rr;
    std::vector<double> uE, uW, vN, vS;  // velocities of the upwind sweeps
    std::vector<float> solve;            // the tridiagonal system of a chain
    void Reserve(int32_t points);
};

// The constants of a sweep call, in 64-bit reals.
struct SweepConstants {
    double g = static_cast<double>(kGravity);
    double B = 0.0, B3 = 0.0, fc = 0.0, dt = 0.0, dx = 0.0, dy = 0.0;
    // Factors of the dispersion terms, formed once a sweep.
    double a1 = 0.0;   // 1/(12 dx dt)
    double g1 = 0.0;   // g dt/(6 dx^2)
    double g2 = 0.0;   // 1/(12 dt)
    double g3 = 0.0;   // B3/(dx^2 dt)
    double t0 = 0.0;   // 1/(12 dy dt)
    double x1 = 0.0;   // -g dt/(6 dx dy)
    double x2 = 0.0;   // B3/(dx dy dt)
};
SweepConstants MakeSweepConstants(const AxisView& v);

// Checks the depths of a chain ("Negative water depth, near (%,%)").
void CheckChainDepth(const AxisView& v, int32_t k, int32_t first, int32_t last);
// Loads the point and face rows of chain (first, last) of line k; central
// loads P as the old flux, the upwind sweeps PPrev. The ghost values of the
// extrapolated surface and the boundary fluxes at the ends are set here.
void LoadChainRows(const AxisView& v, int32_t k, int32_t first, int32_t last, bool central,
                   ChainRows& w);
// Friction factor Fr and flux magnitude U of each face.
void FrictionRows(const AxisView& v, int32_t k, int32_t first, int32_t last, ChainRows& w);
// The roller terms rr of each face (0 with rollers off).
void RollerRows(const AxisView& v, int32_t k, int32_t first, int32_t last, ChainRows& w);
// The eddy viscosity coefficients m1..m4 of each face, multiplied by nP
// (0 with eddy viscosity off); flag is the line order as 0 or 1.
void EddyRows(const AxisView& v, int32_t k, int32_t first, int32_t last, int32_t flag,
              ChainRows& w);
// Dispersion (da, db, dc, dr) and deep-water terms (into dr) of each face;
// central rounds G to 32 bits and tests DP > 0, the upwind sweeps test bed < 0.
void DispersionRows(const AxisView& v, const SweepConstants& s, int32_t k, int32_t first,
                    int32_t last, bool central, ChainRows& w);
// The continuity rows Bc, Rc of each point; central uses cc1 in Bc.
void ContinuityRows(const AxisView& v, int32_t k, int32_t first, int32_t last, bool central,
                    const ChainRows& w, float* Bc, float* Rc);

// The coefficient buffers of the sweeps and the thread-private work, made
// once by SetupSweepBuffers. Buffer values of line k stand at Slice(k) + j.
enum SweepBuffer { kBufE, kBufB, kBufF, kBufR, kBufSideN, kBufSideS, kBufBc, kBufRc,
                   kBufAA, kBufA, kBufC, kBufCC, kBufferCount };
struct SweepBuffers {
    int32_t count = 0;       // 8 for the central sweeps, 12 for the upwind ones
    size_t lineLength = 0;   // max(J,K) + 1
    std::vector<float> buffer[kBufferCount];
    std::vector<ChainRows> rows;         // one per thread
    std::vector<float> A, C, E, F;       // recursion of the double sweep (serial)
    std::vector<float> band;             // band matrix of the third-order sweep, per thread
    std::vector<float> rhs;
    std::vector<int> pivots;
    size_t Slice(int32_t line, int32_t n) const;
    float* Row(SweepBuffer b, int32_t line, int32_t n) { return buffer[b].data() + Slice(line, n); }
};
extern SweepBuffers gSweepBuffers;
