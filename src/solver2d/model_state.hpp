// The state of the 2DH model: the grid, its fields and its tables, the
// settings of the run period and of the equations. Everything here is filled
// by the model setup and then changed only by the time loop, the sweeps and
// the process routines named beside each field.
//
// Fields are 32-bit reals over (0..J, 0..K), stored contiguously with j the
// fastest index: the value at (j,k) stands at k*(J+1) + j.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "platform/geo/geo.hpp"
#include "run/datetime.hpp"

constexpr float kGravity = 9.81f;  // the acceleration of gravity, m/s2

using Field = std::vector<float>;

struct GridState {
    // The grid, from the bathymetry file.
    int32_t J = 0, K = 0;  // highest indices along x and y
    float dx = 0.0f, dy = 0.0f;
    float orientation = 0.0f;  // degrees, from the file's projection block
    double longitude = 0.0;    // geographical position of the grid origin
    double latitude = 0.0;     // degrees; enters the Coriolis factor as it stands
    GeoHandle frame = 0;       // map frame of the grid
    std::string projection;    // projection text of the bathymetry
    float landValue = 0.0f;    // True_land_value: bed at or above it is land
    float referenceLevelShift = 0.0f;
    int32_t waterPoints = 0;  // points below the land value after the shift

    // The run period.
    int32_t timeStepCount = 0;  // steps of the run: the loop runs 1..timeStepCount
    int32_t lastStep = 0;       // Time_step_count less 1, as the model file states it
    double dt = 0.0;            // seconds a step
    int32_t warmUpPeriod = 0;   // steps of the boundary ramp
    DateTime start;             // date and time of step 0

    // Fields (see the table of the time levels in time_loop.hpp).
    Field bed;        // bed level, negative below the datum (setup)
    Field xi;         // surface elevation, newest level (sweeps)
    Field depth;      // total depth xi - bed, slot-corrected (CalculateDepth)
    Field P, Q;       // flux densities at the faces east and north of a point
    Field xiPrev;     // xi before the last sweep
    Field xiPrev2;    // xiPrev before the last sweep
    Field PPrev;      // P one step back (x-sweep)
    Field QPrev;      // Q one step back (y-sweep)
    Field pxyt;       // P - PPrev at the start of the last x-sweep
    Field qxyt;       // Q - QPrev at the start of the last y-sweep
    Field xiExtX;     // surface extrapolated for the x-sweep
    Field xiExtY;     // surface extrapolated for the y-sweep
    Field depthExtX;  // xiExtX - bed
    Field depthExtY;  // xiExtY - bed
    Field work;       // scratch map of setup and output
    Field filterBuffer;
    std::vector<float> PWest;   // flux west of j = 0, one per k
    std::vector<float> QSouth;  // flux south of k = 0, one per j

    size_t Stride() const { return static_cast<size_t>(J) + 1; }
    size_t Points() const { return Stride() * (static_cast<size_t>(K) + 1); }
    size_t At(int32_t j, int32_t k) const { return static_cast<size_t>(k) * Stride() + j; }
};
extern GridState gGrid;

// Equation_Parameters and SOLUTION_PARAMETERS.
struct EquationSettings {
    bool deepWaterTerms = false;
    float dispersionFactor = 0.0f;      // B
    int32_t convectiveHandle = 0;       // 0: XSweep/YSweep; else XSweep_New/YSweep_New
    float extrapolationLower = 0.0f;    // Time_extrapolation_factor_lower
    int32_t depthVaryingExtrapolation = 0;
    float extrapolationUpper = 0.0f;
    float waterDepthLimit = 0.0f;
    float gridScaleFilter = 0.0f;  // Grid_scale_filter: 0 off (grid_filter.hpp)
};
extern EquationSettings gEquation;

// The grid codes and chains (chains.hpp).
struct ChainPair {
    int32_t first = -1, last = -1;
};
struct ChainTables {
    std::vector<int32_t> codeX, codeY;       // over the grid, like a field
    std::vector<int32_t> chainCountX;        // per row k
    std::vector<int32_t> chainCountY;        // per column j
    std::vector<ChainPair> chainX, chainY;   // row k: chainX[k*maxX + n-1], n = 1..count
    int32_t maxChainsX = 0, maxChainsY = 0;  // J/2+1 and K/2+1
    int32_t activePoints = 0;                // CountWaterPoints
    // The points whose surface estimate each half step computes (surfaceX
    // before the x-sweep, from the y chains; surfaceY from the x chains):
    // 1 a point of a chain, 2 the point of a chain of one point, 0 none.
    std::vector<uint8_t> surfaceX, surfaceY;
    const ChainPair& X(int32_t k, int32_t n) const {
        return chainX[static_cast<size_t>(k) * maxChainsX + (n - 1)];
    }
    const ChainPair& Y(int32_t j, int32_t n) const {
        return chainY[static_cast<size_t>(j) * maxChainsY + (n - 1)];
    }
};
extern ChainTables gChains;

// OPTION_PARAMETERS.
struct OptionSettings {
    float spongeReferenceS = 0.0f, spongeReferenceP = 0.0f, spongeReferenceQ = 0.0f;
    int32_t daesMethod = 1;
    int32_t typeOfSupg = -1;
    double supgCoefficient = 0.05;
    double interpolationType = 2.0;
    std::string nameOfTextEditor = "Notepad.exe";
    int32_t hudUpdate2DH = 0;
    int32_t hudUpdate1DH = 0;
    double minimumDepth = static_cast<double>(-0.03f);
};
extern OptionSettings gOptions;

// Allocates every state field of the 2DH model and fills it with its start
// value (xi, P, Q and their old levels 1e-10, depths 10, the rest 0; codes -1).
// bed must already hold the grid. Stops with "Unable to allocate memory".
void AllocateModelState();
// Forgets the whole state (for tests).
void ResetModelState();
// ResetModelState, and every process setting back to what it is before a
// model is read: for the tools that build a model in memory.
void ResetRunState();
