// A closed flume for the tests of the Boussinesq module: a line of linear
// elements (mesh 1: geometry, elevation and auxiliary variable) and its
// quadratic refinement (mesh 2: flux), walls at both ends as the boundary
// setup makes them (velocity node type 3 and auxiliary node type 2, both of
// value 0), and the model record ready for the integrator.
#pragma once

#include <cmath>
#include <functional>
#include <vector>

#include "equations/time_integrators.hpp"
#include "mesh/mesh.hpp"
#include "mesh/shape.hpp"
#include "meshsolver/bw_model.hpp"
#include "meshsolver/equations_bw.hpp"

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
    for (int32_t e = 1; e <= elements; ++e) {
        line.ElementType[e] = kLinearLine;
        line.ElementNodes[line.ElementStart[e]] = e;
        line.ElementNodes[line.ElementStart[e] + 1] = e + 1;
    }
    line.id = 1;
    RefineMesh(line, gMeshes.meshes[2]);
    gMeshes.meshes[2].id = 2;
    gMeshes.number_of_meshes = 2;
    SetupMeshTopology(gMeshes.meshes[1]);
    SetupMeshTopology(gMeshes.meshes[2]);
    FillShapeFunctions(3);

    BwModel& m = gBwModel;
    m.Formulation = formulation;
    m.Beta = beta;
    m.TimeStep = timeStep;
    const int32_t nu = gMeshes.meshes[2].NodeCount, ne = gMeshes.meshes[1].NodeCount;
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

// Linear theory of the equations: omega^2 = g d k^2 (1 + B (kd)^2) / (1 + (B + 1/3)(kd)^2).
inline double TheoryOmega(double k, double d, double B) {
    const double kd2 = (k * d) * (k * d);
    return std::sqrt(9.81 * d * k * k * (1.0 + B * kd2) / (1.0 + (B + 1.0 / 3.0) * kd2));
}

}  // namespace bwtest
