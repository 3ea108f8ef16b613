// The state of the 1DH Boussinesq module: one record, gBwModel, that holds
// the settings read from the mesh solver's file, the fields on the nodes of
// the meshes, the boundary data, the banded systems and the integrator's
// state. Every routine of the mesh solver reads and writes it; tests reset
// it with ResetBwModel.
//
// Index convention, as for the meshes: every vector indexed by a node number
// has an unused slot 0, so that Flux[i] is the flux at node i of the velocity
// mesh. The state vector y of the integrator holds P at y[1..NU] and eta at
// y[NU + 1 .. NU + NE] (ElevationStart = NU + 1), slot 0 unused.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "equations/linear_systems_bw.hpp"
#include "mesh/mesh.hpp"
#include "run/timing.hpp"

// Boundary node types of the three boundary sets.
constexpr int32_t kNodeWallFlux = 1;    // flux prescribed as it stands
constexpr int32_t kNodeNoData = 2;      // code type 2; the auxiliary set's records
constexpr int32_t kNodeFlux = 3;        // a flux boundary: P = -m Q at the node
constexpr int32_t kNodeGeneration = 4;  // an internal generation line: a source of 2 Q

// One node of a boundary set. Value[0] is the newest value (Q_new, for the
// end of the step), Value[1] the one before it (Q_old).
struct BoundaryNode {
    int32_t node = 0;
    int32_t nodeType = 0;
    int32_t components = 1;
    double Value[2] = {0.0, 0.0};
    double direction[2] = {0.0, 0.0};  // direction[0] is m: -1 first node of an element, +1 second
    double weight = 1.0;
};

struct BoundarySet {
    double time = 0.0;                  // time of the newest values
    std::vector<int32_t> recordOfNode;  // node -> index + 1 into records, 0 for none
    std::vector<BoundaryNode> records;
};

// Where the two values of a boundary code come from.
struct DataInput {
    int32_t format = 0;  // 0 constant, 1 time series from a file, 5 a sine
    double constantValues[2] = {0.0, 0.0};
    std::string fileName;
    int32_t itemNumbers[2] = {1, 2};
    int32_t softStartType = 2;  // 0 none, 1 linear, 2 sine
    double softTimeInterval = 0.0;
    double referenceValues[2] = {0.0, 0.0};
    int32_t timeInterpolation = 1;
    double referenceLevel = 0.0, range = 0.0, period = 0.0, phase = 0.0;  // format 5
    // A series read from the file: times in seconds from the run's start and
    // the two items at each.
    std::vector<double> seriesTime, seriesValue[2];
};

struct BoundaryCode {
    int32_t code = 0;
    int32_t type = 0;  // 1, 2 no data; 3, 4 flux; 6 internal generation
    DataInput data;
};

struct SlotSettingsBW {
    int32_t type = 0;
    double depth = -10.0, maxDepth = 10.0, width = 0.005, smoothing = 0.0, friction = 0.0;
};

struct BreakingStateBW {
    int32_t type = 0;
    double rollerFactor = 2.0;
    int32_t velocityType = 1;
    double velocityFactor = 1.3;
    double tanInitial = 0.0, tanFinal = 0.0;  // tangents of the two angles
    double halfTime = 1.0;
    // On the geometry mesh.
    std::vector<double> delta, deltaOld, tanPhi, tanPhiOld, celerity, x, slope;
};

// The integrator (TG3, ABM) and its state.
struct Tg3State {
    int32_t stepCount = 0;
    double lastStageTime = 0.0;
    std::vector<double> y0;
    int32_t status = 0;
};
struct AbmState {
    std::vector<double> YHistory[4], YdotHistory[4];  // column 0 the newest
    std::vector<double> YWork;
    int32_t Order = 1;
    int32_t MaxIterations = 20;
    double Tolerance = 1.0e-6;
    double Relaxation = 1.0;
    int32_t PrintType = 0, PrintUnit = 0;
    int32_t StepCount = 0, FailedSteps = 0, Divergences = 0;
};
struct DaeState {
    int32_t DaeMethod = 1;
    int32_t StateSize = 0;
    std::vector<double> y, ydot;  // 1..StateSize
    Tg3State Tg3;
    AbmState Abm;
};

struct BwModel {
    // The equations (section EQUATION, TIME, SPACE).
    int32_t Dimensions = 1;
    int32_t Formulation = 1;  // 1 classical, 2 enhanced dispersion
    double Beta = 0.0;        // 0 with Formulation 1
    double TimeStep = 0.0;    // time_step_factor x time_step_interval
    // The run's time_step_interval (section TIME of the solver file), set by
    // the driver before SetupEquationBW, which multiplies it by the factor.
    double timeStepInterval = 0.0;
    int32_t startTimeStep = 0, timeStepFactor = 1;
    int32_t Discretization = 2;
    int32_t GeometryMesh = 1, VelocityMesh = 2, ElevationMesh = 1, AuxMesh = 1;  // into gMeshes
    int32_t ElevationStart = 0;  // start of the eta block in y: NU + 1
    int32_t StateSize = 0;       // NU + NE

    // Fields on the nodes.
    std::vector<double> Flux;           // P on the velocity mesh
    std::vector<double> Elevation;      // eta on the elevation mesh
    std::vector<double> ElevationRate;  // d eta / dt of the last right-hand side
    std::vector<double> TotalDepth;     // h
    std::vector<double> StillDepth;     // d
    std::vector<double> SlotWidth;      // b, 1 without a slot
    std::vector<double> Porosity;       // n, 1 without a porosity layer
    std::vector<double> Resistance;     // r on the geometry mesh
    std::vector<double> AuxVariable;    // e on the auxiliary mesh

    // Processes.
    int32_t depthType = 0;
    SlotSettingsBW Slot;
    int32_t resistanceType = 0;  // 0 none, 1 friction factor, 2 Chezy, 3 Manning
    int32_t eddyType = 0;
    int32_t porosityType = 0;
    double porosityAlpha = 0.0, porosityBeta = 0.0;
    int32_t spongeType = 0;
    std::vector<double> spongeVelocity, spongeElevation;  // factors, 1 leaves a node alone
    double spongeReference[2] = {0.0, 0.0};
    int32_t filterType = 0;
    std::vector<double> filterVelocity, filterElevation;  // coefficients
    BreakingStateBW Breaking;

    // Work vectors of the output, on the elevation mesh, refreshed before
    // each output: the bed level -d, the flux at the element ends, the
    // second flux (two horizontal dimensions only) and eta - delta.
    std::vector<double> BedLevel, NodalFlux, NodalFluxQ, ElevationBelowRoller;

    // Start state and boundaries.
    int32_t startType = 0;
    double startValues[2] = {0.0, 0.0};
    std::vector<BoundaryCode> BoundaryCodes;
    BoundarySet VelocitySet, ElevationSet, AuxSet;

    // Solution technique.
    int32_t typeOfSupg = 0;
    double supgCoefficient = 0.0;
    LinearSystemsBW Les;
    bool matricesBuilt = false, auxMatrixBuilt = false;
    DaeState Dae;
    // "Short Wave Simulation": made by the driver with its six tasks; the
    // integrator times tasks 1, 4 and 6 once it has them.
    TimingGroup Timing;
};
extern BwModel gBwModel;

// Empties the record (and leaves the meshes alone).
void ResetBwModel();
