// The state before step 1. A cold start puts a still surface, one level or a
// map, over the fluxes of the allocation (1e-10); a hot start reads the
// state that an earlier run wrote: its items, in file order, are
//   1 scalars, 2 bed, 3 xi, 4 P, 5 Q, 6 xiPrev, 7 PPrev, 8 QPrev, 9 pxyt,
//   10 qxyt, 11 tanPhi, 12 delta, 13 cx, 14 cy, 15-18 generation sources.
// Items 1 and 2 were taken by the bathymetry reader, 15 to 18 are read by
// the internal generation; the roller items are dropped without rollers.
#include "processes/initial_surface.hpp"

#include "data/xolfile.hpp"
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "processes/rollers.hpp"
#include "solver2d/model_state.hpp"
#include "solver2d/time_loop.hpp"

InitialSurfaceSettings gInitialSurface;

namespace {

void ColdStart(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "SURFACE_ELEVATION");
    InitialSurfaceSettings& s = gInitialSurface;
    s = InitialSurfaceSettings{};
    GridState& g = gGrid;
    KvtGetInteger(section, "SURFACE_TYPE", s.surfaceType);
    if (s.surfaceType == 0) {
        KvtGetReal(section, "Constant_Value", s.constantValue);
        g.xi.assign(g.Points(), s.constantValue);
    } else {
        // The map is taken as it stands, on land and under the bed too.
        const DataFileRef ref = ReadDataFile(section, 3);
        s.fileName = ref.fileName;
        s.item = ref.Item();
        ReadGridFile2D(s.fileName, s.item, g.xi.data(), GridShape{g.dx, g.dy, g.J, g.K});
    }
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
    g.xiPrev = g.xi;
    g.xiPrev2 = g.xi;
}

// xiPrev2 is not in the file: it keeps the value of the allocation until
// the first shift of step 1. A value that is no finite number stops the run
// at the item that holds it.
void HotStart() {
    GridState& g = gGrid;
    RollerSettings& r = gRollers;
    XolFile f = XolOpenRead(gBathymetry.fileName);
    float* work = g.work.data();
    const bool rollers = r.type >= 1 && !r.delta.empty();
    float* const items[14] = {work,
                              work,
                              g.xi.data(),
                              g.P.data(),
                              g.Q.data(),
                              g.xiPrev.data(),
                              g.PPrev.data(),
                              g.QPrev.data(),
                              g.pxyt.data(),
                              g.qxyt.data(),
                              rollers ? r.tanPhi.data() : work,
                              rollers ? r.delta.data() : work,
                              rollers ? r.cx.data() : work,
                              rollers ? r.cy.data() : work};
    for (float* values : items) {
        XolReadDynamic(f, values);
        XolCheckFinite(f, values);
    }
    XolClose(f);
    CalculateDepth(g.J, g.K, g.depth.data(), g.bed.data(), g.xi.data());
}

}  // namespace

void SetupInitialSurface(KvtHandle target) {
    if (gBasic.numberOfDimensions != 2) return;
    if (gBathymetry.hotStart)
        HotStart();
    else
        ColdStart(target);
}
