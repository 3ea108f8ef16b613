// Equation_Parameters and SOLUTION_PARAMETERS: the form of the equations
// (the enhanced dispersion terms for deep water and their factor B) and how
// the sweeps treat convection and the time levels of the dispersive terms.
// With two dimensions the state arrays of the grid are allocated here.
#include "input/kvt_access.hpp"
#include "input/model_setup.hpp"
#include "run/messages.hpp"
#include "solver2d/model_state.hpp"

void SetupEquation(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "Equation_Parameters");
    EquationSettings& e = gEquation;
    e.deepWaterTerms = false;
    e.dispersionFactor = 0.0f;
    KvtGetLogical(section, "Deep_Water_Terms", e.deepWaterTerms);
    KvtGetReal(section, "Dispersion_Factor", e.dispersionFactor);
    if (e.deepWaterTerms) {
        if (e.dispersionFactor < -0.333f || e.dispersionFactor > 0.166f)
            StopRun("Dispersion factor out of valid range (-0.333 .. 0.166)");
    } else {
        // Without the enhanced terms B has no meaning: the log keeps what the
        // file said, the equations use 0.
        e.dispersionFactor = 0.0f;
    }
    if (gBasic.numberOfDimensions == 2) AllocateModelState();
}

void ReadSolutionParameters(KvtHandle target) {
    const KvtHandle section = KvtOpenSection(target, "SOLUTION_PARAMETERS");
    EquationSettings& e = gEquation;
    e.convectiveHandle = 0;
    e.extrapolationLower = 0.0f;
    e.depthVaryingExtrapolation = 0;
    e.extrapolationUpper = 0.0f;
    e.waterDepthLimit = 0.0f;
    e.gridScaleFilter = 0.0f;
    KvtGetInteger(section, "Convective_terms_handle", e.convectiveHandle);
    KvtGetReal(section, "Time_extrapolation_factor_lower", e.extrapolationLower);
    KvtGetInteger(section, "Include_depth_varying_time_extrapolation", e.depthVaryingExtrapolation);
    KvtGetReal(section, "Time_extrapolation_factor_upper", e.extrapolationUpper);
    KvtGetReal(section, "Water_depth_limit", e.waterDepthLimit);
    // The grid-scale filter is a key of this engine beside the scheme's own
    // settings; its default of 0 leaves the scheme as it is. Above 1 the
    // filter alone would make the checkerboard mode of the grid grow.
    KvtGetReal(section, "Grid_scale_filter", e.gridScaleFilter);
    if (!(e.gridScaleFilter >= 0.0f && e.gridScaleFilter <= 1.0f))
        StopRun("Grid scale filter out of valid range (0 .. 1)");
    if (!e.deepWaterTerms) {
        // The plain equations centre the dispersive terms in time throughout.
        e.depthVaryingExtrapolation = 0;
        e.extrapolationLower = 1.0f;
    }
}
