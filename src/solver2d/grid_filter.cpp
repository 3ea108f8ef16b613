#include "solver2d/grid_filter.hpp"

#include "processes/internal_generation.hpp"
#include "processes/shoreline.hpp"
#include "solver2d/chains.hpp"

GridFilterState gGridFilter;

namespace {

// Bits of a neighbour table: which neighbours along x (east, west) and y
// (north, south) stand in the same water, whether the place is wet at all,
// whether it is filtered, and whether the chain ends along x (along y) at
// an open boundary there, beyond which the flux goes on (even) instead of
// standing at a closed face (odd).
constexpr uint8_t kEast = 1, kWest = 2, kNorth = 4, kSouth = 8, kWet = 16, kFiltered = 32,
                  kOpenX = 64, kOpenY = 128;

// A point of the chains; with the moving shoreline only where the surface
// stands at or above the bed (a storage width of 1): the filter leaves the
// slot alone and mirrors the surface at the waterline, so that it moves no
// water across it. Read from the map that each setup makes first.
bool Water(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    if (j < 0 || j > g.J || k < 0 || k > g.K) return false;
    return gGridFilter.water[g.At(j, k)] != 0;
}

// A point of the chains, wet or in the slot.
bool Chain(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    return j >= 0 && j <= g.J && k >= 0 && k <= g.K && gChains.codeX[g.At(j, k)] >= 1;
}

// An open boundary point at (j,k).
bool Mark(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    if (j < 0 || j > g.J || k < 0 || k > g.K) return false;
    const size_t p = g.At(j, k);
    const int32_t cx = gChains.codeX[p], cy = gChains.codeY[p];
    return cx == kCodeLevelBoundary || cx == kCodeFluxBoundary || cy == kCodeLevelBoundary ||
           cy == kCodeFluxBoundary;
}

// Whether (j,k) is left alone: an open boundary point, whose values the
// boundary gives, or a point within two of a generation source along x or y.
bool KeptAt(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    if (Mark(j, k)) return true;
    if (gGeneration.numberOfRecords == 0) return false;
    auto source = [&](int32_t jj, int32_t kk) {
        return jj >= 0 && jj <= g.J && kk >= 0 && kk <= g.K &&
               gGeneration.sourceIndex[g.At(jj, kk)] >= 1;
    };
    for (int32_t d = -2; d <= 2; ++d)
        if (source(j + d, k) || source(j, k + d)) return true;
    return false;
}

// KeptAt from the map made with the first tables.
bool Kept(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    if (j < 0 || j > g.J || k < 0 || k > g.K) return false;
    return gGridFilter.kept[g.At(j, k)] != 0;
}

// The second differences along x and y of field F into lapX, lapY. A missing
// neighbour stands for the place itself (even) or for a closed face of
// value 0 (odd), by axis.
void SecondDifferences(const float* F, const uint8_t* flag, bool oddX, bool oddY, float* lx,
                       float* ly) {
    const GridState& g = gGrid;
    const size_t up = g.Stride();
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k) {
        const size_t o = k * up;
        for (size_t p = o; p < o + up; ++p) {
            const uint8_t f = flag[p];
            if (!(f & kWet)) {
                lx[p] = ly[p] = 0.0f;
                continue;
            }
            const float c = F[p];
            const float mx = oddX && !(f & kOpenX) ? 0.0f : c,
                        my = oddY && !(f & kOpenY) ? 0.0f : c;
            lx[p] = ((f & kEast) ? F[p + 1] : mx) - 2.0f * c + ((f & kWest) ? F[p - 1] : mx);
            ly[p] = ((f & kNorth) ? F[p + up] : my) - 2.0f * c + ((f & kSouth) ? F[p - up] : my);
        }
    }
}

void FilterField(float* F, const uint8_t* flag, bool oddX, bool oddY, float coefficient) {
    const GridState& g = gGrid;
    GridFilterState& s = gGridFilter;
    float* lx = s.lapX.data();
    float* ly = s.lapY.data();
    SecondDifferences(F, flag, oddX, oddY, lx, ly);
    const size_t up = g.Stride();
    const float w = coefficient / 16.0f;
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k) {
        const size_t o = k * up;
        for (size_t p = o; p < o + up; ++p) {
            const uint8_t f = flag[p];
            if (!(f & kFiltered)) continue;
            const float cx = lx[p], cy = ly[p];
            const float mx = oddX && !(f & kOpenX) ? 0.0f : cx;
            const float my = oddY && !(f & kOpenY) ? 0.0f : cy;
            const float d = ((f & kEast) ? lx[p + 1] : mx) - 2.0f * cx +
                            ((f & kWest) ? lx[p - 1] : mx) + ((f & kNorth) ? ly[p + up] : my) -
                            2.0f * cy + ((f & kSouth) ? ly[p - up] : my);
            F[p] -= w * d;
        }
    }
}

}  // namespace

void SetupGridScaleFilter() {
    const GridState& g = gGrid;
    GridFilterState& s = gGridFilter;
    const size_t n = g.Points();
    s.point.assign(n, 0);
    s.faceX.assign(n, 0);
    s.faceY.assign(n, 0);
    if (s.lapX.size() != n) s.lapX.assign(n, 0.0f), s.lapY.assign(n, 0.0f);
    // Boundaries and sources do not move: the points they keep are found
    // once; with the moving shoreline the tables are renewed every step.
    if (s.kept.size() != n) {
        s.kept.assign(n, 0);
        for (int32_t k = 0; k <= g.K; ++k)
            for (int32_t j = 0; j <= g.J; ++j) s.kept[g.At(j, k)] = KeptAt(j, k) ? 1 : 0;
    }
    s.water.resize(n);
    const int32_t* code = gChains.codeX.data();
    const float* xi = g.xi.data();
    const float* bed = g.bed.data();
    const bool slot = gShoreline.type > 0;
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k)
        for (size_t p = g.At(0, k); p <= g.At(g.J, k); ++p)
            s.water[p] = (code[p] >= 1) & (!slot | (xi[p] >= bed[p]));
    // The neighbour bits of a place that is wet by the test given: a point,
    // or the face east (di 1) or north (dk 1) of it.
    auto table = [](auto wet, int32_t j, int32_t k, int32_t di, int32_t dk) -> uint8_t {
        if (!wet(j, k)) return 0;
        uint8_t f = kWet;
        if (wet(j + 1, k)) f |= kEast;
        if (wet(j - 1, k)) f |= kWest;
        if (wet(j, k + 1)) f |= kNorth;
        if (wet(j, k - 1)) f |= kSouth;
        if (!Kept(j, k) && !Kept(j + di, k + dk)) f |= kFiltered;
        return f;
    };
    auto point = [](int32_t j, int32_t k) { return Water(j, k); };
    auto faceX = [](int32_t j, int32_t k) { return Water(j, k) && Water(j + 1, k); };
    auto faceY = [](int32_t j, int32_t k) { return Water(j, k) && Water(j, k + 1); };
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j) {
            const size_t p = g.At(j, k);
            s.point[p] = table(point, j, k, 0, 0);
            uint8_t f = table(faceX, j, k, 1, 0);
            // Beyond an open boundary, and beyond the waterline into the slot,
            // the flux goes on; only land closes a face.
            if (f && ((!(f & kWest) && (Mark(j, k) || Chain(j - 1, k))) ||
                      (!(f & kEast) && (Mark(j + 1, k) || Chain(j + 2, k)))))
                f |= kOpenX;
            s.faceX[p] = f;
            f = table(faceY, j, k, 0, 1);
            if (f && ((!(f & kSouth) && (Mark(j, k) || Chain(j, k - 1))) ||
                      (!(f & kNorth) && (Mark(j, k + 1) || Chain(j, k + 2)))))
                f |= kOpenY;
            s.faceY[p] = f;
        }
}

void CalcGridScaleFilter() {
    GridState& g = gGrid;
    const GridFilterState& s = gGridFilter;
    const float c = gEquation.gridScaleFilter;
    // The waterline moves with the moving shoreline: the tables follow it.
    if (gShoreline.type > 0) SetupGridScaleFilter();
    for (Field* F : {&g.xi, &g.xiPrev}) FilterField(F->data(), s.point.data(), false, false, c);
    // The flux across a face is odd about a closed face along its own axis.
    for (Field* F : {&g.P, &g.PPrev}) FilterField(F->data(), s.faceX.data(), true, false, c);
    for (Field* F : {&g.Q, &g.QPrev, &g.qxyt})
        FilterField(F->data(), s.faceY.data(), false, true, c);
}
