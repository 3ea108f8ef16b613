// Moving shoreline by the slot technique. Below a beach point of bed b lies a
// slot down to the level `slotDepth`, of relative width
//
//     W(z) = w + (1 - w) exp(-lambda r),   r = (b - z) / hs,  hs = min(999, b - slotDepth),
//
// at a level z under the bed, and of full width 1 above it. The storage width
// c is W at the surface; the effective depth is the integral of W from the
// slot's bottom up to the surface, which is v + hs((1 - e)(1 - w)/lambda + w)
// for a plain depth v = surface - b above 0 (e = exp(-lambda)), and
// hs((exp(-lambda r) - e)(1 - w)/lambda + (1 - r) w) with r = -v/hs below it.
// Both forms meet at v = 0. All of it is worked in 64-bit reals.
#include "processes/shoreline.hpp"

#include <algorithm>
#include <cmath>

#include "input/kvt_access.hpp"
#include "solver2d/model_state.hpp"

ShorelineSettings gShoreline;

void SetupMovingShoreline(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "MOVING_SHORELINE");
    ShorelineSettings& s = gShoreline;
    s = ShorelineSettings{};
    KvtGetInteger(section, "type", s.type);
    if (s.type != 1) return;
    KvtGetDouble(section, "depth", s.slotDepth);
    KvtGetDouble(section, "width", s.width);
    KvtGetDouble(section, "smoothing_parameter", s.lambda);
    KvtGetDouble(section, "friction_coefficient", s.frictionCoefficient);
}

double StorageWidth(double surface, double d, double slotDepth, double maxDepth, double width,
                    double lambda) {
    const double b = -d;
    const double hs0 = b - slotDepth;
    if (hs0 > 0.0 && b > surface) {
        const double r = (b - surface) / std::min(maxDepth, hs0);
        return width + (1.0 - width) * std::exp(-lambda * r);
    }
    return 1.0;
}

float StorageWidthAt(int32_t j, int32_t k, float surface) {
    if (gShoreline.type <= 0) return 1.0f;
    const ShorelineSettings& s = gShoreline;
    const double d = -static_cast<double>(gGrid.bed[gGrid.At(j, k)]);
    return static_cast<float>(StorageWidth(surface, d, s.slotDepth, s.maxDepth, s.width, s.lambda));
}

void SlotCorrection(float* target, const float* bed) {
    const ShorelineSettings& s = gShoreline;
    const GridState& g = gGrid;
    const double w = s.width, lambda = s.lambda;
    const double e = std::exp(-lambda);
    const int32_t rows = g.K + 1;
    const size_t stride = g.Stride();
#pragma omp parallel for schedule(static)
    for (int32_t k = 0; k < rows; ++k) {
        for (size_t p = k * stride; p < (k + 1) * stride; ++p) {
            if (!(g.landValue > bed[p])) continue;
            const double hs0 = static_cast<double>(bed[p]) - s.slotDepth;
            if (!(hs0 > 0.0)) continue;
            const double hs = std::min(s.maxDepth, hs0);
            double v = target[p];
            if (v > 0.0) {
                v += hs * ((1.0 - e) * (1.0 - w) / lambda + w);
            } else {
                const double r = -v / hs;
                v = hs * ((std::exp(-lambda * r) - e) * (1.0 - w) / lambda + (1.0 - r) * w);
            }
            target[p] = static_cast<float>(v);
        }
    }
}

// A drying point in the slot has a storage width near `width`: a flux held
// across the other half step would drain it 1/width times faster than its
// water allows, deep into the slot in one half step, and the next sweep
// would take the depth of that surface near 0. The limit keeps such a point
// from losing more than it holds.
constexpr double kOutflowShare = 0.25;  // of the water a point holds, a half step

void LimitOutflow(int32_t axis) {
    GridState& g = gGrid;
    ShorelineSettings& s = gShoreline;
    const size_t n = g.Points(), stride = g.Stride();
    if (s.outflowFactor.size() != n) s.outflowFactor.assign(n, 1.0f);
    float* factor = s.outflowFactor.data();
    float* F = axis == 1 ? g.P.data() : g.Q.data();
    const size_t along = axis == 1 ? 1 : stride;
    // Water above the bed that may leave over the half step, as a flux sum.
    const double scale = kOutflowShare * (axis == 1 ? g.dx : g.dy) / (0.5 * g.dt);
    const float* xi = g.xi.data();
    const float* bed = g.bed.data();
    const int32_t J = g.J, K = g.K;
#pragma omp parallel for schedule(static)
    for (int32_t k = 1; k < K; ++k)
        for (size_t p = g.At(1, k); p < g.At(J, k); ++p) {
            const double out = std::max(static_cast<double>(F[p]), 0.0) +
                               std::max(-static_cast<double>(F[p - along]), 0.0);
            const double water = std::max(static_cast<double>(xi[p]) - bed[p], 0.0);
            const double allowed = water * scale;
            factor[p] = out > allowed ? static_cast<float>(allowed / out) : 1.0f;
        }
#pragma omp parallel for schedule(static)
    for (int32_t k = 1; k < K; ++k)
        for (size_t p = g.At(1, k); p < g.At(J, k); ++p) {
            // The face between p and the next point along the axis.
            const size_t q = p + along;
            const bool inner = axis == 1 ? p + 1 < g.At(J, k) : k + 1 < K;
            if (F[p] > 0.0f && factor[p] < 1.0f)
                F[p] *= factor[p];
            else if (F[p] < 0.0f && inner && factor[q] < 1.0f)
                F[p] *= factor[q];
        }
}
