// Column-major copies of the fields for the y-sweep. A y line is a column of
// the x-fastest fields, whose values lie a whole row apart in memory; read in
// place, every value costs a cache line. The copies are made by a transpose
// in tiles that fit the cache, so that both the reading and the writing run
// along memory, and the y-sweep then reads its lines as the x-sweep does.
#include <omp.h>

#include <algorithm>
#include <new>

#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "run/messages.hpp"
#include "solver2d/sweep_rows.hpp"

ColumnCopies gColumns;

namespace {

constexpr int32_t kTile = 32;

// out(j,k) at j*rows + k from in(j,k) at k*columns + j, or back.
template <typename T>
void Transpose(const T* in, T* out, int32_t columns, int32_t rows, bool back) {
    const int32_t tilesJ = (columns + kTile - 1) / kTile;
#pragma omp parallel for schedule(static)
    for (int32_t tj = 0; tj < tilesJ; ++tj) {
        const int32_t j0 = tj * kTile, j1 = std::min(j0 + kTile, columns);
        for (int32_t k0 = 0; k0 < rows; k0 += kTile) {
            const int32_t k1 = std::min(k0 + kTile, rows);
            for (int32_t j = j0; j < j1; ++j)
                for (int32_t k = k0; k < k1; ++k) {
                    const size_t rowMajor = static_cast<size_t>(k) * columns + j;
                    const size_t columnMajor = static_cast<size_t>(j) * rows + k;
                    if (back)
                        out[rowMajor] = in[columnMajor];
                    else
                        out[columnMajor] = in[rowMajor];
                }
        }
    }
}

template <typename T>
void In(const std::vector<T>& field, std::vector<T>& copy) {
    if (field.empty()) return;
    copy.resize(field.size());
    Transpose(field.data(), copy.data(), gGrid.J + 1, gGrid.K + 1, false);
}

void Out(const Field& copy, Field& field) {
    Transpose(copy.data(), field.data(), gGrid.J + 1, gGrid.K + 1, true);
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
    In(g.xiPrev, c.xiPrev);
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
