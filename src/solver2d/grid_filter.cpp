#include "solver2d/grid_filter.hpp"

#include "processes/internal_generation.hpp"
#include "solver2d/chains.hpp"

GridFilterState gGridFilter;

namespace {

// Bits of a neighbour table: which neighbours along x (east, west) and y
// (north, south) stand in the same water, whether the place is wet at all,
// and whether it is filtered.
constexpr uint8_t kEast = 1, kWest = 2, kNorth = 4, kSouth = 8, kWet = 16, kFiltered = 32;

bool Water(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    return j >= 0 && j <= g.J && k >= 0 && k <= g.K && gChains.codeX[g.At(j, k)] >= 1;
}

// An open boundary mark or a generation source at (j,k).
bool Fed(int32_t j, int32_t k) {
    const GridState& g = gGrid;
    if (j < 0 || j > g.J || k < 0 || k > g.K) return false;
    const size_t p = g.At(j, k);
    const int32_t cx = gChains.codeX[p], cy = gChains.codeY[p];
    if (cx == kCodeLevelBoundary || cx == kCodeFluxBoundary || cy == kCodeLevelBoundary ||
        cy == kCodeFluxBoundary)
        return true;
    return gGeneration.numberOfRecords > 0 && gGeneration.sourceIndex[p] >= 1;
}

// Whether the plus-shaped stencil of radius 2 around (j,k) meets a fed point.
bool NearFed(int32_t j, int32_t k) {
    for (int32_t d = -2; d <= 2; ++d)
        if (Fed(j + d, k) || Fed(j, k + d)) return true;
    return false;
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
            const float c = F[p], mx = oddX ? 0.0f : c, my = oddY ? 0.0f : c;
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
            const float mx = oddX ? 0.0f : cx, my = oddY ? 0.0f : cy;
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
    s.lapX.assign(n, 0.0f);
    s.lapY.assign(n, 0.0f);
    auto wetX = [](int32_t j, int32_t k) { return Water(j, k) && Water(j + 1, k); };
    auto wetY = [](int32_t j, int32_t k) { return Water(j, k) && Water(j, k + 1); };
    for (int32_t k = 0; k <= g.K; ++k)
        for (int32_t j = 0; j <= g.J; ++j) {
            const size_t p = g.At(j, k);
            const bool near = NearFed(j, k);
            if (Water(j, k)) {
                uint8_t f = kWet;
                if (Water(j + 1, k)) f |= kEast;
                if (Water(j - 1, k)) f |= kWest;
                if (Water(j, k + 1)) f |= kNorth;
                if (Water(j, k - 1)) f |= kSouth;
                if (!near) f |= kFiltered;
                s.point[p] = f;
            }
            if (wetX(j, k)) {
                uint8_t f = kWet;
                if (wetX(j + 1, k)) f |= kEast;
                if (wetX(j - 1, k)) f |= kWest;
                if (wetX(j, k + 1)) f |= kNorth;
                if (wetX(j, k - 1)) f |= kSouth;
                if (!near && !NearFed(j + 1, k)) f |= kFiltered;
                s.faceX[p] = f;
            }
            if (wetY(j, k)) {
                uint8_t f = kWet;
                if (wetY(j + 1, k)) f |= kEast;
                if (wetY(j - 1, k)) f |= kWest;
                if (wetY(j, k + 1)) f |= kNorth;
                if (wetY(j, k - 1)) f |= kSouth;
                if (!near && !NearFed(j, k + 1)) f |= kFiltered;
                s.faceY[p] = f;
            }
        }
}

void CalcGridScaleFilter() {
    GridState& g = gGrid;
    const GridFilterState& s = gGridFilter;
    const float c = gEquation.gridScaleFilter;
    for (Field* F : {&g.xi, &g.xiPrev}) FilterField(F->data(), s.point.data(), false, false, c);
    // The flux across a face is odd about a closed face along its own axis.
    for (Field* F : {&g.P, &g.PPrev}) FilterField(F->data(), s.faceX.data(), true, false, c);
    for (Field* F : {&g.Q, &g.QPrev, &g.qxyt})
        FilterField(F->data(), s.faceY.data(), false, true, c);
}
