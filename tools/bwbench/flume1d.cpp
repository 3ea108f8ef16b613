// The 1DH part of bwbench: how fast the mesh solver steps a flume. A line of
// linear elements (geometry, surface, auxiliary variable) and its quadratic
// refinement (flux) are built in memory as the driver would from a DOMAIN
// section, with the model's defaults of a translated 1DH model: formulation 2
// with B = 1/15, TG3, SUPG of type -1 with coefficient 0.05, three Gauss
// points. Waves come in through a sine flux at the left end, the right end
// is a wall; the model reads the clocks of the driver's timing group as a
// run does. The table gives the time of 1000 steps on one core and the
// nodes (of the surface mesh, as the run statistics count them) times steps
// per CPU second, and where a step spends it: the element sums, the band
// solves and the rest, each routine timed again on the state the run left;
// then the band solves written out here, as a share of the library's time
// and whether they give the same bits, and the share of the clock reads
// (part of the rest). A third flume has the processes of a beach on: the
// rollers, the slot and the wave statistics that the driver feeds after
// each step (without files).
#include "flume1d.hpp"

#include <omp.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <vector>

#include "equations/band_matrix.hpp"
#include "equations/time_integrators.hpp"
#include "input/kvt_current.hpp"
#include "mesh/mesh.hpp"
#include "mesh/shape.hpp"
#include "mesh/space_discretization.hpp"
#include "meshsolver/boundary_bw.hpp"
#include "meshsolver/bw_model.hpp"
#include "meshsolver/equations_bw.hpp"
#include "meshsolver/output_bw.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "meshsolver/statistics_bw.hpp"
#include "platform/kvt/kvt.hpp"
#include "run/timing.hpp"

namespace {

constexpr double kSpacing = 0.05;        // m between surface nodes
constexpr double kDepth = 0.5;           // m, the flat part
constexpr double kShallowEnd = 0.2;      // m at the wall of the sloping flume
constexpr double kTimeStep = 0.01;       // s: a Courant number of 0.44 on the flat part
constexpr double kPeriod = 1.5;          // s: kd about 1.2, some 50 nodes a wave length
constexpr double kFluxAmplitude = 0.04;  // m2/s: a wave of about 2 cm

constexpr int32_t kInflowCode = 3, kWallCode = 2;

void AddRecord(BoundarySet& set, int32_t node, int32_t nodeType, double m) {
    BoundaryNode r;
    r.node = node;
    r.nodeType = nodeType;
    r.direction[0] = m;
    set.records.push_back(r);
    set.recordOfNode[node] = static_cast<int32_t>(set.records.size());
}

double StillDepthAt(double x, double length, bool sloping) {
    if (!sloping) return kDepth;
    // Flat for the first 30 %, then a straight slope up to the shallow end.
    const double start = 0.3 * length;
    if (x <= start) return kDepth;
    return kDepth + (kShallowEnd - kDepth) * (x - start) / (length - start);
}

// The flume of `nodes` surface nodes, at rest, its matrices not yet built.
BwModel& BuildFlume(int32_t nodes, bool sloping) {
    ResetMeshModel();
    ResetBwModel();
    const int32_t elements = nodes - 1;
    const double length = elements * kSpacing;
    Mesh& line = gMeshes.meshes[1];
    AllocateMesh(line, nodes, elements, 2, "bench");
    line.dimension = 1;
    for (int32_t i = 1; i <= nodes; ++i) {
        line.x[i] = (i - 1) * kSpacing;
        line.z[i] = -StillDepthAt(line.x[i], length, sloping);
    }
    line.code[1] = kInflowCode;
    line.code[nodes] = kWallCode;
    MakeLineElements(line);
    line.id = 1;
    SetupMeshTopology(line);
    AddQuadraticMesh();
    FillShapeFunctions(3);

    BwModel& m = gBwModel;
    m.Dimensions = 1;
    m.Formulation = 2;
    m.Beta = 1.0 / 15.0;
    m.timeStepInterval = m.TimeStep = kTimeStep;
    m.typeOfSupg = -1;
    m.supgCoefficient = 0.05;
    const int32_t nu = gMeshes.meshes[2].NodeCount, ne = line.NodeCount;
    m.ElevationStart = nu + 1;
    m.StateSize = nu + ne;
    m.Flux.assign(nu + 1, 0.0);
    m.Elevation.assign(ne + 1, 0.0);
    m.ElevationRate.assign(ne + 1, 0.0);
    m.TotalDepth.assign(ne + 1, 0.0);
    m.StillDepth.assign(ne + 1, 0.0);
    for (int32_t i = 1; i <= ne; ++i) m.StillDepth[i] = -line.z[i];
    m.SlotWidth.assign(ne + 1, 1.0);
    m.Porosity.assign(ne + 1, 1.0);
    m.Resistance.assign(ne + 1, 0.0);
    m.AuxVariable.assign(ne + 1, 0.0);

    // The inflow: a flux code whose value is a sine; the wall keeps 0.
    BoundaryCode inflow;
    inflow.code = kInflowCode;
    inflow.type = 3;
    inflow.data.format = 5;
    inflow.data.range = 2.0 * kFluxAmplitude;
    inflow.data.period = kPeriod;
    m.BoundaryCodes.push_back(inflow);
    m.VelocitySet.recordOfNode.assign(nu + 1, 0);
    AddRecord(m.VelocitySet, 1, kNodeFlux, -1.0);
    AddRecord(m.VelocitySet, nu, kNodeFlux, 1.0);
    m.ElevationSet.recordOfNode.assign(ne + 1, 0);
    m.AuxSet.recordOfNode.assign(ne + 1, 0);
    AddRecord(m.AuxSet, 1, kNodeNoData, -1.0);
    AddRecord(m.AuxSet, ne, kNodeNoData, 1.0);

    SetupLesBW(m.Les, nu, ne, ne);
    m.Dae.StateSize = m.StateSize;
    m.Dae.y.assign(m.StateSize + 1, 0.0);
    m.Dae.ydot.assign(m.StateSize + 1, 0.0);
    m.Dae.DaeMethod = 1;
    SetupTG3(m);
    // The driver's timing group: a run reads the clocks around its parts.
    InitTiming(m.Timing, "Short Wave Simulation", 6);
    AddTiming(m.Timing, kTaskUpdateForcings, "Update forcings");
    AddTiming(m.Timing, kTaskSolveBoussinesq, "Solve Bousinesq eq.");
    AddTiming(m.Timing, kTaskSetupLinearSystem, "  Setup linear equation system");
    AddTiming(m.Timing, kTaskSolveLinearSystem, "  Solve linear Equation system");
    AddTiming(m.Timing, kTaskOtherCalculationBW, "Other calculation");
    AddTiming(m.Timing, kTaskShortWaveTotal, "Total");
    int32_t status = 0;
    UpdateStageBW(0.0, 0.0, m.Dae.y, m, status);
    UpdateForcingsBW(0.0, m);
    return m;
}

// Rollers with their defaults, the slot 0.1 m under the deepest bed with a
// friction of 0.1, and the wave statistics of every node from the start,
// set up through a solver file of one section as a run reads it.
void SwitchOnProcesses(BwModel& m, int32_t steps) {
    BreakingStateBW& b = m.Breaking;
    b.type = 1;
    b.tanInitial = std::tan(20.0 * M_PI / 180.0);
    b.tanFinal = std::tan(10.0 * M_PI / 180.0);
    const size_t n = static_cast<size_t>(gMeshes.meshes[1].NodeCount) + 1;
    for (std::vector<double>* v : {&b.delta, &b.deltaOld, &b.celerity, &b.slope}) v->assign(n, 0.0);
    b.tanPhi.assign(n, b.tanInitial);
    b.tanPhiOld.assign(n, b.tanInitial);
    m.Slot.type = 1;
    m.Slot.depth = -(kDepth + 0.1);
    m.Slot.width = 0.01;
    m.Slot.smoothing = 100.0;
    m.Slot.friction = 0.1;
    for (std::vector<double>* v :
         {&m.BedLevel, &m.NodalFlux, &m.NodalFluxQ, &m.ElevationBelowRoller})
        v->assign(n, 0.0);
    const char* path = "bwbench_statistics.kvt";
    if (FILE* f = std::fopen(path, "w")) {
        std::fputs("MeshSolverBW {\nWAVE_STATISTIC {\nType_of_wave_statistic = 1\n}\n}\n", f);
        std::fclose(f);
    }
    KvtHandle file = KvtOpenFile(path, false);
    KvtUseFile(file);
    KvtOpenTarget("MeshSolverBW");
    gMeshRun.LastStep = steps;
    SetupWaveStatisticBW(m);
    kvtClose(&file);
    std::remove(path);
}

// The solve of a system factored by dgbtrf written out for one right-hand
// side: the steps of dgbtrs ('N', NRHS = 1) with its row swaps and the
// updates of its dger and dtbsv in their order, so that each value comes
// out of the same operations; b holds the right-hand side on entry and the
// solution on return. Each row waits for the one before (a division and a
// multiply-add in the back substitution), so a solve is bound by latency:
// two independent systems are stepped together, row j of one beside row j
// of the other, for the processor to overlap their chains. What a band
// solve of its own would gain, measured beside the library's.
struct Band {
    int32_t n = 0, kl = 0, k = 0;
    size_t ld = 0;
    const double* ab = nullptr;
    const int* piv = nullptr;
    double* b = nullptr;
};

Band BandOf(const LinearSystem& system, double* b) {
    const BandMatrix& m = system.Matrix;
    return {m.Order,
            m.LowerDiagonals,
            m.LowerDiagonals + m.UpperDiagonals,
            static_cast<size_t>(m.LeadingDimension),
            m.Values.data(),
            system.Pivots.data(),
            b};
}

// Column j (0-based) of L^-1 with its swap.
inline void ForwardColumn(const Band& s, int32_t j) {
    double* b = s.b;
    const int32_t lm = std::min(s.kl, s.n - 1 - j);
    const int32_t p = s.piv[j] - 1;
    if (p != j) std::swap(b[p], b[j]);
    if (b[j] != 0.0) {
        const double temp = -b[j];
        const double* l = s.ab + j * s.ld + s.k + 1;  // AB(KD+1, J), KD = KL + KU + 1
        for (int32_t i = 1; i <= lm; ++i) b[j + i] = b[j + i] + l[i - 1] * temp;
    }
}

// Column j of U^-1: U has bandwidth kl + ku, its diagonal in row kl + ku + 1.
inline void BackwardColumn(const Band& s, int32_t j) {
    double* b = s.b;
    if (b[j] == 0.0) return;
    const double* col = s.ab + j * s.ld;
    b[j] = b[j] / col[s.k];
    const double temp = b[j];
    for (int32_t i = j - 1; i >= std::max(0, j - s.k); --i) b[i] = b[i] - temp * col[s.k + i - j];
}

void WrittenOutSolve(const Band& a) {
    for (int32_t j = 0; j < a.n - 1; ++j) ForwardColumn(a, j);
    for (int32_t j = a.n - 1; j >= 0; --j) BackwardColumn(a, j);
}

// Two systems together: the same operations on each as WrittenOutSolve.
void WrittenOutSolves(const Band& a, const Band& c) {
    const int32_t n = std::max(a.n, c.n);
    for (int32_t j = 0; j < n - 1; ++j) {
        if (j < a.n - 1) ForwardColumn(a, j);
        if (j < c.n - 1) ForwardColumn(c, j);
    }
    for (int32_t r = 0; r < n; ++r) {
        if (r < a.n) BackwardColumn(a, a.n - 1 - r);
        if (r < c.n) BackwardColumn(c, c.n - 1 - r);
    }
}

// CPU seconds a call, over `calls` calls.
template <typename F>
double CpuPerCall(int32_t calls, F f) {
    const double start = CpuSeconds();
    for (int32_t i = 0; i < calls; ++i) f(i);
    return (CpuSeconds() - start) / calls;
}

struct FlumeCost {
    double step = 0.0, wallStep = 0.0;    // seconds a step
    double elements = 0.0, solves = 0.0;  // seconds a step in each part
    double timers = 0.0;                  // the driver's clock reads
    double ownSolves = 0.0;               // the same solves written out
    bool identical = true;                // and their results bit for bit
    double maxEta = 0.0;                  // m, the largest surface at the end
    bool blewUp = false;
};

// The best of `repeats` runs of `steps` steps (the machine is shared), and
// the parts timed again on the state of the last run.
FlumeCost MeasureFlume(int32_t nodes, bool sloping, int32_t steps, int repeats, bool processes) {
    FlumeCost c;
    c.step = c.wallStep = 1e30;
    std::vector<OutputFile> noFiles;
    for (int r = 0; r < repeats; ++r) {
        BwModel& m = BuildFlume(nodes, sloping);
        if (processes) SwitchOnProcesses(m, steps);
        int32_t status = 0;
        const double cpu0 = CpuSeconds(), wall0 = WallSeconds();
        for (int32_t s = 1; s <= steps && status == 0; ++s) {
            SolveTimeStepBW(s * kTimeStep, m, status);
            if (processes) WriteOutputHD3D(s, 0, noFiles, m);
        }
        c.step = std::min(c.step, (CpuSeconds() - cpu0) / steps);
        c.wallStep = std::min(c.wallStep, (WallSeconds() - wall0) / steps);
        c.blewUp = status != 0;
    }
    BwModel& m = gBwModel;
    for (size_t i = 1; i < m.Elevation.size(); ++i)
        c.maxEta = std::max(c.maxEta, std::abs(m.Elevation[i]));

    // A step is three stages; each stage makes one right-hand side (element
    // sums, then the flux and the surface solve) and one auxiliary solve.
    // Each part is timed three times, the best kept.
    const int32_t calls = std::max(20, steps / 4);
    std::vector<double> y = m.Dae.y, ydot(y.size()), x(y.size()), z(y.size());
    std::vector<double> xa(y.size()), za(y.size());  // the auxiliary solves
    const double t = steps * kTimeStep;
    const int32_t nu = m.ElevationStart - 1, ne = m.StateSize - nu;
    int32_t info = 0;
    double element = 1e30, solve = 1e30, own = 1e30, timer = 1e30;
    for (int r = 0; r < 3; ++r) {
        element =
            std::min(element, CpuPerCall(calls, [&](int32_t) { CalcElementRhsBW(t, y, m, ydot); }));
        solve = std::min(solve, CpuPerCall(calls, [&](int32_t) {
                             SolveBGE(m.Les.FluxMatrix, ydot.data() + 1, x.data() + 1, 2, info);
                             SolveBGE(m.Les.ElevationMatrix, ydot.data() + m.ElevationStart,
                                      x.data() + 1 + nu, 2, info);
                             SolveBGE(m.Les.AuxMatrix, ydot.data() + m.ElevationStart,
                                      xa.data() + 1, 2, info);
                         }));
        own = std::min(own, CpuPerCall(calls, [&](int32_t) {
                           std::copy(ydot.begin() + 1, ydot.end(), z.begin() + 1);
                           WrittenOutSolves(BandOf(m.Les.FluxMatrix, z.data() + 1),
                                            BandOf(m.Les.ElevationMatrix, z.data() + 1 + nu));
                           std::copy(ydot.begin() + 1 + nu, ydot.end(), za.begin() + 1);
                           WrittenOutSolve(BandOf(m.Les.AuxMatrix, za.data() + 1));
                       }));
    }
    // A step starts and stops 5 tasks: the step, the forcings, and the
    // solves of each of its 3 stages.
    for (int r = 0; r < 3; ++r)
        timer = std::min(timer, CpuPerCall(calls, [&](int32_t) {
                             StartTiming(m.Timing, kTaskSolveLinearSystem);
                             StopTiming(m.Timing, kTaskSolveLinearSystem);
                         }));
    c.timers = 5.0 * timer;
    c.identical = std::memcmp(x.data() + 1, z.data() + 1, sizeof(double) * (nu + ne)) == 0 &&
                  std::memcmp(xa.data() + 1, za.data() + 1, sizeof(double) * ne) == 0;
    c.elements = 3.0 * element;
    c.solves = 3.0 * solve;
    c.ownSolves = 3.0 * own;
    return c;
}

}  // namespace

void FlumeTable(double scale, int32_t onlyNodes) {
    omp_set_num_threads(1);
    std::printf(
        "\n1DH flume, formulation 2 (B = 1/15), TG3, dx %.2f m, dt %.2f s, 1 core; "
        "best of 3 runs\n",
        kSpacing, kTimeStep);
    std::printf("%-8s %-8s %8s %11s %12s %14s %9s %7s %6s %9s %11s %6s\n", "nodes", "flume",
                "steps", "ms/1000 st", "wall ms/1000", "nodes*steps/s", "elements", "solves",
                "rest", "max |eta|", "own solves", "timers");
    const std::vector<int32_t> sizes =
        onlyNodes > 0 ? std::vector<int32_t>{onlyNodes} : std::vector<int32_t>{2000, 20000};
    struct Case {
        bool sloping, processes;
    };
    for (int32_t nodes : sizes)
        for (const Case k : {Case{false, false}, Case{true, false}, Case{true, true}}) {
            const bool sloping = k.sloping;
            const int32_t steps = std::max(50, static_cast<int32_t>(scale * 2e7 / nodes));
            const FlumeCost c = MeasureFlume(nodes, sloping, steps, 3, k.processes);
            const double e = c.elements / c.step, s = c.solves / c.step;
            // The written-out solves: their time as a share of the library's,
            // and whether they gave the same bits.
            std::printf(
                "%-8d %-8s %8d %11.1f %12.1f %14.3e %8.0f%% %6.0f%% %5.0f%% %9.4f %6.0f%% %-6s "
                "%5.1f%%%s\n",
                nodes, k.processes ? "beach" : (sloping ? "sloping" : "flat"), steps, 1e6 * c.step,
                1e6 * c.wallStep, nodes / c.step, 100.0 * e, 100.0 * s, 100.0 * (1.0 - e - s),
                c.maxEta, 100.0 * c.ownSolves / c.solves, c.identical ? "same" : "DIFFER",
                100.0 * c.timers / c.step, c.blewUp ? " blew up" : "");
            std::fflush(stdout);
        }
    ResetBwModel();
    ResetMeshModel();
}
