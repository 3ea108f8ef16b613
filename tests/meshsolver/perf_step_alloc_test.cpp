// A time step of the 1DH mesh solver allocates nothing once the model is set
// up: a flume driven by a sine flux at one end is stepped with TG3 and with
// ABM while the global operator new of this binary counts the allocations.
// A step that builds a vector (of the boundary values, of a work array) costs
// a call to the allocator three or more times a step and shows here first.
#include <gtest/gtest.h>

#include <atomic>
#include <cmath>
#include <cstdlib>
#include <new>

#include "equations_flume.hpp"

namespace {
std::atomic<long> gAllocations{0};
}

void* operator new(std::size_t size) {
    gAllocations.fetch_add(1, std::memory_order_relaxed);
    if (void* p = std::malloc(size == 0 ? 1 : size)) return p;
    throw std::bad_alloc();
}
void operator delete(void* p) noexcept {
    std::free(p);
}
void operator delete(void* p, std::size_t) noexcept {
    std::free(p);
}

namespace {

// A flume of 40 elements, 0.5 m deep, a sine flux of period 1.5 s in at the
// left end (code 3, type 3), the wall at the right end, formulation 2 with
// SUPG as a translated model has it. Allocations over steps 6..25, after
// five steps that build the matrices and (ABM) fill the history; the inflow
// must have moved the surface.
TEST(StepAllocations, StepsOfADrivenFlumeAllocateNothingWithEitherIntegrator) {
    for (const int32_t daeMethod : {1, 2}) {
        SCOPED_TRACE(daeMethod == 1 ? "TG3" : "ABM");
        const long atSetup = gAllocations.load();
        BwModel& m = bwtest::BuildFlume(
            40, 2.0, [](double) { return 0.5; }, 2, 1.0 / 15.0, 0.01);
        bwtest::SetNodeCode(1, 3);
        m.typeOfSupg = -1;
        m.supgCoefficient = 0.05;
        BoundaryCode inflow;
        inflow.code = inflow.type = 3;
        inflow.data.format = 5;
        inflow.data.range = 0.08;
        inflow.data.period = 1.5;
        m.BoundaryCodes.push_back(inflow);
        m.Dae.DaeMethod = daeMethod;
        const size_t n = static_cast<size_t>(m.StateSize) + 1;
        for (int c = 0; c < 4; ++c) {
            m.Dae.Abm.YHistory[c].assign(n, 0.0);
            m.Dae.Abm.YdotHistory[c].assign(n, 0.0);
        }
        m.Dae.Abm.YWork.assign(n, 0.0);
        bwtest::StartFlume(m, [](double) { return 0.0; });
        UpdateForcingsBW(0.0, m);
        ASSERT_GT(gAllocations.load(), atSetup) << "the counter does not see the setup's vectors";

        int32_t status = 0;
        for (int32_t s = 1; s <= 5; ++s) SolveTimeStepBW(s * 0.01, m, status);
        ASSERT_EQ(status, 0);
        const long before = gAllocations.load();
        for (int32_t s = 6; s <= 25 && status == 0; ++s) SolveTimeStepBW(s * 0.01, m, status);
        const long allocations = gAllocations.load() - before;
        ASSERT_EQ(status, 0);
        EXPECT_EQ(allocations, 0) << "allocations in 20 steps";
        EXPECT_GT(std::abs(m.Elevation[1]), 1e-4) << "the inflow did not reach the surface";
    }
}

}  // namespace
