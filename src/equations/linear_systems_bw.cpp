#include "equations/linear_systems_bw.hpp"

#include <new>
#include <stdexcept>

#include "run/messages.hpp"

namespace {

void MakeSystem(LinearSystem& system, int32_t order, int32_t halfBand) {
    AllocateBandMatrix(system.Matrix, order, halfBand, halfBand);
    SetupBGE(system, order);
}

}  // namespace

void SetupLesBW(LinearSystemsBW& les, int32_t velocityNodes, int32_t elevationNodes,
                int32_t auxNodes) {
    MakeSystem(les.FluxMatrix, velocityNodes, 2);
    MakeSystem(les.ElevationMatrix, elevationNodes, 1);
    MakeSystem(les.AuxMatrix, auxNodes, 1);
    les.StateSize = velocityNodes + elevationNodes;
    try {
        les.work1.assign(static_cast<size_t>(les.StateSize) + 1, 0.0);
        les.work2.assign(static_cast<size_t>(les.StateSize) + 1, 0.0);
    } catch (const std::bad_alloc&) {
        StopRun("SetupLesBW: Out of memory");
    } catch (const std::length_error&) {
        StopRun("SetupLesBW: Out of memory");
    }
}
