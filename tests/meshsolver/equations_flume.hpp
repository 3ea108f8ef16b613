// A closed flume for the tests of the Boussinesq module: a line of linear
// elements (mesh 1: geometry, elevation and auxiliary variable) and its
// quadratic refinement (mesh 2: flux), walls at both ends as the boundary
// setup makes them (velocity node type 3 and auxiliary node type 2, both of
// value 0), the model record ready for the integrator; the boundary codes
// read into it from a solver file; the standing wave of one wavelength
// between its walls.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <numbers>
#include <string>
#include <vector>

#include "equations/time_integrators.hpp"
#include "input/kvt_access.hpp"
#include "input/kvt_current.hpp"
#include "mesh/mesh.hpp"
#include "mesh/shape.hpp"
#include "mesh/space_discretization.hpp"
#include "meshsolver/boundary_bw.hpp"
#include "meshsolver/bw_model.hpp"
#include "meshsolver/equations_bw.hpp"
#include "meshsolver/run_mesh_solver.hpp"
#include "platform/kvt/kvt.hpp"
#include "profile_run.hpp"

namespace bwtest {

inline void AddRecord(BoundarySet& set, int32_t node, int32_t nodeType, double m) {
    BoundaryNode r;
    r.node = node;
    r.nodeType = nodeType;
    r.direction[0] = m;
    set.records.push_back(r);
    set.recordOfNode[node] = static_cast<int32_t>(set.records.size());
}

// Meshes of `elements` elements over 0..length with still water depth
// depth(x), the model with the given equations and step, walls at the ends.
inline BwModel& BuildFlume(int32_t elements, double length,
                           const std::function<double(double)>& depth, int32_t formulation,
                           double beta, double timeStep) {
    ResetMeshModel();
    ResetBwModel();
    Mesh& line = gMeshes.meshes[1];
    AllocateMesh(line, elements + 1, elements, 2, "test");
    line.dimension = 1;
    for (int32_t i = 1; i <= elements + 1; ++i) {
        line.x[i] = length * (i - 1) / elements;
        line.z[i] = -depth(line.x[i]);
    }
    line.code[1] = line.code[elements + 1] = 2;
    MakeLineElements(line);
    line.id = 1;
    SetupMeshTopology(line);
    AddQuadraticMesh();
    FillShapeFunctions(3);

    BwModel& m = gBwModel;
    m.Formulation = formulation;
    m.Beta = beta;
    m.TimeStep = timeStep;
    const int32_t nu = gMeshes.meshes[2].NodeCount, ne = gMeshes.meshes[1].NodeCount;
    m.ElevationStart = nu + 1;
    m.StateSize = nu + ne;
    m.Flux.assign(nu + 1, 0.0);
    for (auto* v : {&m.Elevation, &m.ElevationRate, &m.TotalDepth, &m.StillDepth, &m.Resistance,
                    &m.AuxVariable})
        v->assign(ne + 1, 0.0);
    for (int32_t i = 1; i <= ne; ++i) m.StillDepth[i] = -line.z[i];
    m.SlotWidth.assign(ne + 1, 1.0);
    m.Porosity.assign(ne + 1, 1.0);

    m.VelocitySet.recordOfNode.assign(nu + 1, 0);
    AddRecord(m.VelocitySet, 1, kNodeFlux, -1.0);
    AddRecord(m.VelocitySet, nu, kNodeFlux, 1.0);
    m.AuxSet.recordOfNode.assign(ne + 1, 0);
    AddRecord(m.AuxSet, 1, kNodeNoData, -1.0);
    AddRecord(m.AuxSet, ne, kNodeNoData, 1.0);

    SetupLesBW(m.Les, nu, ne, ne);
    m.Dae.StateSize = m.StateSize;
    m.Dae.y.assign(m.StateSize + 1, 0.0);
    m.Dae.ydot.assign(m.StateSize + 1, 0.0);
    m.Dae.DaeMethod = 1;
    SetupTG3(m);
    return m;
}

// Gives node `node` of the line (and its node in the flux mesh) the code
// and sets up the code sections of both meshes again.
inline void SetNodeCode(int32_t node, int32_t code) {
    gMeshes.meshes[1].code[node] = code;
    gMeshes.meshes[2].code[2 * node - 1] = code;
    SetupMeshTopology(gMeshes.meshes[1]);
    SetupMeshTopology(gMeshes.meshes[2]);
}

// Reads BOUNDARY_CONDITIONS made of the CODE_n sections `codes` into m, for
// a run of `steps` steps of dt from 2004-01-01, with the solver file at path.
inline void ReadBoundaryConditions(BwModel& m, const std::string& path, const std::string& codes,
                                   double dt, int32_t steps) {
    gMeshRun = MeshRunState{};
    gMeshRun.StartDate = MakeDateTime(2004, 1, 1, 0, 0, 0);
    gMeshRun.TimeStepInterval = dt;
    gMeshRun.LastStep = steps;
    WriteFile(path, "MeshSolverBW {\nBOUSSINESQ_WAVE_MODULE {\nBOUNDARY_CONDITIONS {\n" + codes +
                        "}\n}\n}\n");
    testing::internal::CaptureStdout();
    KvtHandle file = KvtOpenFile(path, false);
    KvtUseFile(file);
    KvtOpenTarget("MeshSolverBW");
    KvtOpenSection("BOUSSINESQ_WAVE_MODULE");
    SetupBoundCondBW(m);
    KvtCloseSection();
    kvtClose(&file);
    testing::internal::GetCapturedStdout();
}

// Starts the flume from rest with the surface eta0(x) and brings depth,
// auxiliary variable and copies in line with it.
inline void StartFlume(BwModel& m, const std::function<double(double)>& eta0) {
    const Mesh& line = gMeshes.meshes[1];
    std::fill(m.Dae.y.begin(), m.Dae.y.end(), 0.0);
    for (int32_t i = 1; i <= line.NodeCount; ++i)
        m.Dae.y[m.ElevationStart + i - 1] = eta0(line.x[i]);
    int32_t status = 0;
    UpdateStageBW(0.0, 0.0, m.Dae.y, m, status);
}

// The integral of eta with the linear shapes.
inline double SurfaceVolume(const BwModel& m) {
    const Mesh& line = gMeshes.meshes[1];
    double v = 0.0;
    for (int32_t e = 1; e <= line.ElementCount; ++e)
        v += 0.5 * line.ElementLength[e] * (m.Elevation[e] + m.Elevation[e + 1]);
    return v;
}

// A standing wave of one wavelength (wave number kd) between the walls of a
// flat flume 1 m deep, from rest with the surface amplitude cos(k x): the
// period from the zero crossings of the surface at the left wall, the
// largest drift of the volume, and the surface at the end.
struct StandingWave {
    double period = 0.0, theory = 0.0, volumeDrift = 0.0, waterVolume = 0.0;
    int32_t status = 0;
    std::vector<double> surface;
};

inline StandingWave RunStandingWave(double kd, int32_t formulation, double beta, int32_t elements,
                                    int32_t stepsPerPeriod, int32_t periods, double amplitude) {
    const double k = kd, length = 2.0 * std::numbers::pi / k;
    StandingWave w;
    w.theory = 2.0 * std::numbers::pi / TheoryOmega(k, 1.0, beta);
    w.waterVolume = length;
    const double dt = w.theory / stepsPerPeriod;
    BwModel& m = BuildFlume(
        elements, length, [](double) { return 1.0; }, formulation, beta, dt);
    StartFlume(m, [&](double x) { return amplitude * std::cos(k * x); });
    const double v0 = SurfaceVolume(m);
    double previous = m.Elevation[1], first = -1.0, last = -1.0;
    int32_t crossings = 0;
    for (int32_t s = 1; s <= periods * stepsPerPeriod; ++s) {
        SolveTimeStepBW(s * dt, m, w.status);
        if (w.status != 0) return w;
        const double now = m.Elevation[1];
        if ((previous > 0.0) != (now > 0.0)) {
            last = (s - 1) * dt + dt * previous / (previous - now);
            if (crossings++ == 0) first = last;
        }
        previous = now;
        w.volumeDrift = std::max(w.volumeDrift, std::abs(SurfaceVolume(m) - v0));
    }
    w.period = crossings > 1 ? 2.0 * (last - first) / (crossings - 1) : 0.0;
    w.surface = m.Elevation;
    return w;
}

}  // namespace bwtest
