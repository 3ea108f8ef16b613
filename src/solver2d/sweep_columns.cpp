// Column-major copies of the fields for the y-sweep. A y line is a column of
// the x-fastest fields, whose values lie a whole row apart in memory; read in
// place, every value costs a cache line. The copies are made by a transpose
// in tiles that fit the cache, so that both the reading and the writing run
// along memory, and the y-sweep then reads its lines as the x-sweep does.
#include <omp.h>

#include <algorithm>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif
#include <new>

#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "run/messages.hpp"
#include "solver2d/sweep_rows.hpp"

ColumnCopies gColumns;

namespace {

constexpr int32_t kTile = 32;

// dst(c, r) = src(r, c), where src holds rows x cols values row by row and
// dst cols x rows. Threads take tiles of src columns, so that each writes
// its own rows of dst; inside a tile, blocks of 4 x 4 go through the vector
// registers where the processor has them.
template <typename T>
void Transpose(const T* src, T* dst, int32_t rows, int32_t cols) {
    const int32_t tiles = (cols + kTile - 1) / kTile;
#pragma omp parallel for schedule(static)
    for (int32_t t = 0; t < tiles; ++t) {
        const int32_t c0 = t * kTile, c1 = std::min(c0 + kTile, cols);
        for (int32_t r0 = 0; r0 < rows; r0 += kTile) {
            const int32_t r1 = std::min(r0 + kTile, rows);
            auto at = [&](int32_t r, int32_t c) { return static_cast<size_t>(r) * cols + c; };
            auto to = [&](int32_t c, int32_t r) { return static_cast<size_t>(c) * rows + r; };
            int32_t c = c0;
#if defined(__SSE2__)
            if constexpr (sizeof(T) == 4) {
                for (; c + 4 <= c1; c += 4) {
                    int32_t r = r0;
                    for (; r + 4 <= r1; r += 4) {
                        __m128i a0 = _mm_loadu_si128(reinterpret_cast<const __m128i*>(src + at(r, c)));
                        __m128i a1 = _mm_loadu_si128(reinterpret_cast<const __m128i*>(src + at(r + 1, c)));
                        __m128i a2 = _mm_loadu_si128(reinterpret_cast<const __m128i*>(src + at(r + 2, c)));
                        __m128i a3 = _mm_loadu_si128(reinterpret_cast<const __m128i*>(src + at(r + 3, c)));
                        const __m128i t0 = _mm_unpacklo_epi32(a0, a1), t1 = _mm_unpacklo_epi32(a2, a3);
                        const __m128i t2 = _mm_unpackhi_epi32(a0, a1), t3 = _mm_unpackhi_epi32(a2, a3);
                        a0 = _mm_unpacklo_epi64(t0, t1);
                        a1 = _mm_unpackhi_epi64(t0, t1);
                        a2 = _mm_unpacklo_epi64(t2, t3);
                        a3 = _mm_unpackhi_epi64(t2, t3);
                        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst + to(c, r)), a0);
                        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst + to(c + 1, r)), a1);
                        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst + to(c + 2, r)), a2);
                        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst + to(c + 3, r)), a3);
                    }
                    for (; r < r1; ++r)
                        for (int32_t i = 0; i < 4; ++i) dst[to(c + i, r)] = src[at(r, c + i)];
                }
            }
#endif
            for (; c < c1; ++c)
                for (int32_t r = r0; r < r1; ++r) dst[to(c, r)] = src[at(r, c)];
        }
    }
}

template <typename T>
void In(const std::vector<T>& field, std::vector<T>& copy) {
    if (field.empty()) return;
    copy.resize(field.size());
    Transpose(field.data(), copy.data(), gGrid.K + 1, gGrid.J + 1);
}

void Out(const Field& copy, Field& field) {
    Transpose(copy.data(), field.data(), gGrid.J + 1, gGrid.K + 1);
}

}  // namespace

void CopyStaticColumns() {
    ColumnCopies& c = gColumns;
    try {
        In(gGrid.bed, c.bed);
        In(gPorosity.porosity, c.porosity);
        In(gChains.codeY, c.codeN);
        In(gChains.codeX, c.codeE);
        c.friction.clear();
        if (gFriction.resistanceType == 2) In(gFriction.frictionCoef, c.friction);
        c.source.clear();
        if (gGeneration.numberOfRecords > 0) In(gGeneration.sourceIndex, c.source);
        for (Field* f : {&c.depth, &c.xiPrev, &c.xi, &c.Q, &c.QPrev, &c.qxyt, &c.P, &c.PPrev, &c.pxyt,
                         &c.xiExt, &c.depthExt})
            f->assign(gGrid.Points(), 0.0f);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
}

void CopyColumnsIn() {
    const GridState& g = gGrid;
    ColumnCopies& c = gColumns;
    In(g.depth, c.depth);
    if (gShoreline.type > 0) In(g.xiPrev, c.xiPrev);  // read only by the slot's storage width
    In(g.xi, c.xi);
    In(g.Q, c.Q);
    In(g.QPrev, c.QPrev);
    In(g.qxyt, c.qxyt);
    In(g.P, c.P);
    In(g.PPrev, c.PPrev);
    In(g.pxyt, c.pxyt);
    In(g.xiExtY, c.xiExt);
    In(g.depthExtY, c.depthExt);
    if (gEddy.eddyType == 1 || gEddy.eddyType == 2) In(gEddy.eddyViscosity, c.nu);
    if (gRollers.type == 1 && !gRollers.delta.empty()) {
        In(gRollers.delta, c.delta);
        In(gRollers.cx, c.cx);
        In(gRollers.cy, c.cy);
    }
}

void CopyColumnsOut() {
    GridState& g = gGrid;
    ColumnCopies& c = gColumns;
    Out(c.xi, g.xi);
    Out(c.Q, g.Q);
    Out(c.QPrev, g.QPrev);
    Out(c.qxyt, g.qxyt);
}
