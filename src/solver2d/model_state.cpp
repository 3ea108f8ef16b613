#include "solver2d/model_state.hpp"

#include <new>

#include "processes/friction.hpp"
#include "processes/internal_generation.hpp"
#include "processes/open_boundaries.hpp"
#include "processes/porosity.hpp"
#include "processes/rollers.hpp"
#include "processes/shoreline.hpp"
#include "processes/sponge.hpp"
#include "run/memory.hpp"
#include "run/messages.hpp"
#include "solver2d/grid_filter.hpp"

GridState gGrid;
EquationSettings gEquation;
ChainTables gChains;
OptionSettings gOptions;

namespace {

void Fill(Field& field, size_t points, float value) {
    field.assign(points, value);
}

}  // namespace

void AllocateModelState() {
    GridState& g = gGrid;
    const size_t n = g.Points();
    // Sixteen fields of 32-bit reals and the two code tables, weighed before
    // any is taken.
    const double bytes = 16.0 * sizeof(float) + 2.0 * sizeof(gChains.codeX[0]);
    CheckMemory(Filled(Filled("the state of a grid of % x % points", g.J + 1), g.K + 1),
                static_cast<double>(n), bytes);
    try {
        for (Field* f : {&g.xi, &g.P, &g.Q, &g.xiPrev, &g.PPrev, &g.QPrev, &g.xiPrev2})
            Fill(*f, n, 1e-10f);
        for (Field* f : {&g.depth, &g.depthExtX, &g.depthExtY}) Fill(*f, n, 10.0f);
        for (Field* f : {&g.xiExtX, &g.xiExtY, &g.pxyt, &g.qxyt, &g.work, &g.filterBuffer})
            Fill(*f, n, 0.0f);
        g.PWest.assign(static_cast<size_t>(g.K) + 1, 0.0f);
        g.QSouth.assign(static_cast<size_t>(g.J) + 1, 0.0f);
        gChains.codeX.assign(n, -1);
        gChains.codeY.assign(n, -1);
    } catch (const std::bad_alloc&) {
        StopRun("Unable to allocate memory");
    }
}

void ResetModelState() {
    gGrid = GridState{};
    gEquation = EquationSettings{};
    gChains = ChainTables{};
    gOptions = OptionSettings{};
    gGridFilter = GridFilterState{};
}

void ResetRunState() {
    ResetModelState();
    gPorosity = PorositySettings{};
    gShoreline = ShorelineSettings{};
    gSponge = SpongeSettings{};
    gFilter = FilterSettings{};
    gFriction = FrictionSettings{};
    gEddy = EddySettings{};
    gRollers = RollerSettings{};
    gGeneration = GenerationState{};
    gBoundaries = BoundaryState{};
}
