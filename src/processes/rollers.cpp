// Wave breaking by surface rollers: the settings of WAVE_BREAKING and the
// start state of the roller fields. A roller starts with no thickness, the
// initial (steep) critical slope, and the celerity of a developed roller,
//     c = velocity_factor sqrt(g max(-bed, minimum_depth)),
// along the breaking direction.
#include "processes/rollers.hpp"

#include <algorithm>
#include <cmath>
#include <new>

#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "run/messages.hpp"
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

// Placeholder until the roller passes land; the model reader still refuses
// rollers, so nothing reaches this.
void CalcBreaking(const float* /*xiExt*/, int32_t /*axis*/) {}
