#include "meshsolver/equations_bw.hpp"

#include <algorithm>
#include <cmath>
#include <new>
#include <stdexcept>

#include "equations/time_integrators.hpp"
#include "input/kvt_current.hpp"
#include "mesh/shape.hpp"
#include "meshsolver/processes_bw.hpp"
#include "run/messages.hpp"

namespace {

// The element loops keep the values of the shape functions at the Gauss
// points on the stack: the two shapes of a line mesh share their points.
constexpr int32_t kMaxGauss = 8;

struct LineRule {
    int32_t G = 0;
    double w[kMaxGauss + 1];
    double N[4][kMaxGauss + 1];   // quadratic shape values, local nodes 1..3
    double dN[4][kMaxGauss + 1];  // their reference derivatives (divide by J for x)
    double M[3][kMaxGauss + 1];   // linear shape values, local nodes 1..2
};

const Shape& ShapeOfMesh(const Mesh& mesh) {
    return gShapes.shapes[mesh.ElementShape[1]];
}

// The quadratic rule from the velocity mesh, the linear one from the
// elevation mesh (or only the linear one when velocity is null).
void LoadRule(const Mesh* velocity, const Mesh& elevation, LineRule& rule) {
    const Shape& lin = ShapeOfMesh(elevation);
    rule.G = lin.gaussCount;
    if (rule.G > kMaxGauss) StopRun("CalcMatricesBW: Too many Gauss points");
    for (int32_t q = 1; q <= rule.G; ++q) {
        rule.w[q] = lin.gaussWeight[q];
        rule.M[1][q] = lin.N[1][q];
        rule.M[2][q] = lin.N[2][q];
    }
    if (velocity == nullptr) return;
    const Shape& quad = ShapeOfMesh(*velocity);
    for (int32_t q = 1; q <= rule.G; ++q)
        for (int32_t k = 1; k <= 3; ++k) {
            rule.N[k][q] = quad.N[k][q];
            rule.dN[k][q] = quad.dN[k][q];
        }
}

const BoundaryNode* RecordAt(const BoundarySet& set, int32_t node) {
    if (node >= static_cast<int32_t>(set.recordOfNode.size())) return nullptr;
    const int32_t k = set.recordOfNode[node];
    return k > 0 ? &set.records[k - 1] : nullptr;
}

const BoundaryNode* GenerationAt(const BoundarySet& set, int32_t node) {
    const BoundaryNode* r = RecordAt(set, node);
    return r != nullptr && r->nodeType == kNodeGeneration ? r : nullptr;
}

void StartTask(BwModel& model, int task) {
    if (model.Timing.taskCount >= task) StartTiming(model.Timing, task);
}
void StopTask(BwModel& model, int task) {
    if (model.Timing.taskCount >= task) StopTiming(model.Timing, task);
}

void CheckMeshNumber(int32_t number) {
    if (number < 1 || number > gMeshes.number_of_meshes)
        StopRun("SetupEquationBW: Mesh number " + std::to_string(number) + " does not exist");
}

}  // namespace

double BoundaryValueAt(const BoundaryNode& record, const BoundarySet& set, double t,
                       double timeStep) {
    if (timeStep <= 0.0) return record.Value[0];
    const double theta = (set.time - t) / timeStep;
    return record.Value[0] * (1.0 - theta) + record.Value[1] * theta;
}

void SetupEquationBW(int32_t dimensions, BwModel& model) {
    model.Dimensions = dimensions;

    KvtOpenSection("EQUATION");
    model.Formulation = 1;
    KvtGetInteger("formulation", model.Formulation);
    if (model.Formulation == 2) {
        float beta = 0.067f;
        KvtGetReal("beta", beta);
        model.Beta = beta;
    } else {
        model.Beta = 0.0;
    }
    KvtCloseSection();

    KvtOpenSection("TIME");
    KvtGetInteger("start_time_step", model.startTimeStep);
    model.timeStepFactor = 1;
    KvtGetInteger("time_step_factor", model.timeStepFactor);
    KvtCloseSection();
    model.TimeStep = model.timeStepFactor * model.timeStepInterval;

    KvtOpenSection("SPACE");
    model.GeometryMesh = 1;
    model.VelocityMesh = gMeshes.number_of_meshes == 1 ? 1 : 2;
    model.ElevationMesh = 1;
    model.AuxMesh = 1;
    KvtGetInteger("number_of_mesh_geometry", model.GeometryMesh);
    KvtGetInteger("number_of_mesh_velocity", model.VelocityMesh);
    KvtGetInteger("number_of_mesh_elevation", model.ElevationMesh);
    KvtGetInteger("number_of_mesh_aux_var", model.AuxMesh);
    const bool same = model.GeometryMesh == model.VelocityMesh &&
                      model.VelocityMesh == model.ElevationMesh &&
                      model.ElevationMesh == model.AuxMesh;
    model.Discretization = same ? 1 : 2;
    KvtGetInteger("discretization", model.Discretization);
    KvtCloseSection();
    for (int32_t m : {model.GeometryMesh, model.VelocityMesh, model.ElevationMesh, model.AuxMesh})
        CheckMeshNumber(m);

    const int32_t nu = gMeshes.meshes[model.VelocityMesh].NodeCount;
    const int32_t ne = gMeshes.meshes[model.ElevationMesh].NodeCount;
    const int32_t ng = gMeshes.meshes[model.GeometryMesh].NodeCount;
    const int32_t na = gMeshes.meshes[model.AuxMesh].NodeCount;
    model.ElevationStart = nu + 1;
    model.StateSize = nu + ne;
    try {
        model.Flux.assign(nu + 1, 0.0);
        model.Elevation.assign(ne + 1, 0.0);
        model.ElevationRate.assign(ne + 1, 0.0);
        model.TotalDepth.assign(ne + 1, 0.0);
        model.StillDepth.assign(ne + 1, 0.0);
        model.SlotWidth.assign(ne + 1, 1.0);
        model.Porosity.assign(ne + 1, 1.0);
        model.Resistance.assign(ng + 1, 0.0);
        model.AuxVariable.assign(na + 1, 0.0);
    } catch (const std::bad_alloc&) {
        StopRun("SetupDaesBW: Out of memory");
    } catch (const std::length_error&) {
        StopRun("SetupDaesBW: Out of memory");
    }
}

void SetupSolutionBW(BwModel& model) {
    KvtOpenSection("SOLUTION_TECHNIQUE");
    model.typeOfSupg = 0;
    model.supgCoefficient = 0.0;
    KvtGetInteger("type_of_supg", model.typeOfSupg);
    KvtGetDouble("supg_coefficient", model.supgCoefficient);
    // The section's own method: 2 names an iteration whose keys are read
    // for the record; no 1DH run uses them.
    int32_t method = 1;
    KvtGetInteger("method", method);
    if (method == 2) {
        int32_t maxIterations = 6, printType = 0;
        double tolerance = 1.0e-6;
        KvtGetInteger("max_iterations", maxIterations);
        KvtGetDouble("tolerance", tolerance);
        KvtGetInteger("type_of_print", printType);
    }
    SetupDaesBW(model);
    SetupLesBW(model.Les, gMeshes.meshes[model.VelocityMesh].NodeCount,
               gMeshes.meshes[model.ElevationMesh].NodeCount,
               gMeshes.meshes[model.AuxMesh].NodeCount);
    KvtCloseSection();
}

void CalcMatricesBW(BwModel& model) {
    const Mesh& vm = gMeshes.meshes[model.VelocityMesh];
    const Mesh& em = gMeshes.meshes[model.ElevationMesh];
    BandMatrix& A = model.Les.FluxMatrix.Matrix;
    BandMatrix& B = model.Les.ElevationMatrix.Matrix;
    ClearBandMatrix(A);
    ClearBandMatrix(B);
    LineRule r;
    LoadRule(&vm, em, r);
    const double* d = model.StillDepth.data();
    const double* n = model.Porosity.data();
    const double c1 = model.Beta + 1.0 / 3.0;        // (beta + 1/3) d^2 P_xxt
    const double c2 = 2.0 * model.Beta + 1.0 / 3.0;  // its part by parts with (1/3) d d_x P_xt

    for (int32_t e = 1; e <= vm.ElementCount; ++e) {
        if (vm.ElementActive[e] == 0) continue;
        const int32_t v[3] = {GetElementNode(vm, e, 1), GetElementNode(vm, e, 2),
                              GetElementNode(vm, e, 3)};
        const int32_t i = GetElementNode(em, e, 1), j = GetElementNode(em, e, 2);
        const double L = em.ElementLength[e], J = 0.5 * L;
        const double dx = (d[j] - d[i]) / L;
        // An element with a node on land has no dispersion.
        const double phi = (d[i] < 0.0 || d[j] < 0.0) ? 0.0 : 1.0;
        double a[3][3] = {}, b[2][2] = {};
        for (int32_t q = 1; q <= r.G; ++q) {
            const double W = r.w[q] * J;
            const double m1 = r.M[1][q], m2 = r.M[2][q];
            const double dq = m1 * d[i] + m2 * d[j];
            const double Wn = W * (m1 * n[i] + m2 * n[j]);
            const double N[3] = {r.N[1][q], r.N[2][q], r.N[3][q]};
            const double dN[3] = {r.dN[1][q] / J, r.dN[2][q] / J, r.dN[3][q] / J};
            for (int p = 0; p < 3; ++p) {
                const double rowTerm = c1 * dq * dN[p] + c2 * dx * N[p];
                for (int s = 0; s < 3; ++s)
                    a[p][s] += Wn * (N[s] * N[p] + phi * dq * dN[s] * rowTerm);
            }
            const double M[2] = {m1, m2};
            for (int p = 0; p < 2; ++p)
                for (int s = 0; s < 2; ++s) b[p][s] += Wn * M[p] * M[s];
        }
        for (int p = 0; p < 3; ++p)
            for (int s = 0; s < 3; ++s) AddBandEntry(A, v[p], v[s], a[p][s]);
        const int32_t en[2] = {i, j};
        for (int p = 0; p < 2; ++p)
            for (int s = 0; s < 2; ++s) AddBandEntry(B, en[p], en[s], b[p][s]);
    }
    // Prescribed fluxes: their rows return the rate set by CalcRhsBW.
    for (const BoundaryNode& rec : model.VelocitySet.records)
        if (rec.nodeType == kNodeWallFlux || rec.nodeType == kNodeFlux) SetIdentityRow(A, rec.node);
    model.matricesBuilt = true;
}

namespace {

// The element sums of the momentum and continuity equations, for a rule of
// kGauss points known to the compiler (the three of every solver file), or
// of r.G points when kGauss is 0.
template <int32_t kGauss>
void ElementSums(double t, const std::vector<double>& y, BwModel& model, std::vector<double>& ydot,
                 const LineRule& r) {
    const int32_t G = kGauss > 0 ? kGauss : r.G;
    const Mesh& vm = gMeshes.meshes[model.VelocityMesh];
    const Mesh& em = gMeshes.meshes[model.ElevationMesh];
    const Mesh& gm = gMeshes.meshes[model.GeometryMesh];

    const double* P = y.data();
    double* dP = ydot.data();
    double* dEta = ydot.data() + model.ElevationStart - 1;  // dEta[i]: node i of the elevation mesh
    const double* eta = y.data() + model.ElevationStart - 1;
    const double* h = model.TotalDepth.data();
    const double* d = model.StillDepth.data();
    const double* n = model.Porosity.data();
    const double* b = model.SlotWidth.data();
    const double* aux = model.AuxVariable.data();
    const double* res = model.Resistance.data();
    const double beta = model.Beta;
    const double c1 = beta + 1.0 / 3.0;
    const double c2 = 2.0 * beta + 1.0 / 3.0;
    const double dt = model.TimeStep;
    const BoundarySet& vset = model.VelocitySet;
    const bool manning = model.resistanceType == 3;
    const bool supg = model.typeOfSupg == -1;
    const BreakingStateBW& br = model.Breaking;
    const bool rollers = br.type > 0;
    bool anyGeneration = false;
    for (const BoundaryNode& rec : vset.records) anyGeneration |= rec.nodeType == kNodeGeneration;

    for (int32_t e = 1; e <= vm.ElementCount; ++e) {
        if (vm.ElementActive[e] == 0) continue;
        const int32_t v[3] = {GetElementNode(vm, e, 1), GetElementNode(vm, e, 2),
                              GetElementNode(vm, e, 3)};
        const int32_t i = GetElementNode(em, e, 1), j = GetElementNode(em, e, 2);
        const int32_t gi = GetElementNode(gm, e, 1), gj = GetElementNode(gm, e, 2);
        const double L = em.ElementLength[e], J = 0.5 * L, invJ = 2.0 / L;
        const double dM2 = 1.0 / L, dM1 = -dM2;

        // First-order parts of the element.
        const double hx = h[i] * dM1 + h[j] * dM2;
        const double etax = eta[i] * dM1 + eta[j] * dM2;
        const double dx = d[i] * dM1 + d[j] * dM2;
        const double Pbar = (P[v[0]] + P[v[1]] + P[v[2]]) / 3.0;
        const double absP = std::abs(Pbar);
        const double hbar = 0.5 * (h[i] + h[j]);
        const double nbar = 0.5 * (n[i] + n[j]);
        const double phi = (d[i] < 0.0 || d[j] < 0.0) ? 0.0 : 1.0;

        double tau = 0.0;
        if (hbar > 0.0) {
            const double rbar = 0.5 * (res[gi] + res[gj]);
            double D = hbar * hbar;
            if (manning) {
                // A short series for hbar^(1/6), with its constants as they stand.
                const double x = std::log(hbar) * 0.16666;
                const double E = ((x * 0.166667 + 0.5) * x + 1.0) * x + 1.0;
                D = hbar * hbar * E * E;
            }
            tau = rbar * absP / D;
            if (1.0 - nbar > 0.0001)
                tau += model.porosityAlpha * (1.0 - nbar) * (1.0 - nbar) * (1.0 - nbar) +
                       model.porosityBeta * absP * (1.0 - nbar) / (hbar * nbar);
            if (b[i] < 0.99 || b[j] < 0.99) tau += model.Slot.friction * absP / (hbar * hbar);
        }

        // A generation line at a corner node: the flux on this side of it.
        const BoundaryNode* genA = anyGeneration ? GenerationAt(vset, v[0]) : nullptr;
        const BoundaryNode* genB = anyGeneration ? GenerationAt(vset, v[1]) : nullptr;
        const double Qa = genA != nullptr ? BoundaryValueAt(*genA, vset, t, dt) : 0.0;
        const double Qb = genB != nullptr ? BoundaryValueAt(*genB, vset, t, dt) : 0.0;
        const bool stabilise = supg && absP > 1.0e-10;
        const double supgFactor =
            stabilise ? (Pbar > 0.0 ? 1.0 : -1.0) * J * model.supgCoefficient : 0.0;

        double rP[3] = {0.0, 0.0, 0.0}, rEta[2] = {0.0, 0.0};
        for (int32_t q = 1; q <= G; ++q) {
            const double W = r.w[q] * J;
            const double N1 = r.N[1][q], N2 = r.N[2][q], N3 = r.N[3][q];
            const double dN1 = r.dN[1][q] * invJ, dN2 = r.dN[2][q] * invJ, dN3 = r.dN[3][q] * invJ;
            const double m1 = r.M[1][q], m2 = r.M[2][q];
            double Pq = P[v[0]] * N1 + P[v[1]] * N2 + P[v[2]] * N3;
            double Px = P[v[0]] * dN1 + P[v[1]] * dN2 + P[v[2]] * dN3;
            Pq += N1 * Qa - N2 * Qb;
            Px += dN1 * Qa - dN2 * Qb;
            const double eq = m1 * aux[i] + m2 * aux[j];
            const double dq = std::max(0.0, m1 * d[i] + m2 * d[j]);
            const double hq = m1 * h[i] + m2 * h[j];
            const double nq = m1 * n[i] + m2 * n[j];
            const double invH = 1.0 / hq;
            const double u = Pq * invH;
            const double ux = (Px - hx * u) * invH;
            double R = 0.0;
            if (rollers) {
                const double deltaq = m1 * br.delta[gi] + m2 * br.delta[gj];
                if (deltaq > 0.0) {
                    const double cq = m1 * br.celerity[gi] + m2 * br.celerity[gj] - u;
                    R = cq * cq * deltaq / (1.0 - deltaq * invH);
                }
            }
            double S = (beta * 9.81 * nq * nq * eq * dq * dq - R) * phi;
            S += (ux * Pq + u * Px) * supgFactor;
            const double G = (ux + tau) * Pq +
                             (9.81 * hq * etax + 19.62 * beta * phi * eq * dx * dq) * nq * nq +
                             u * Px;
            rP[0] -= W * (N1 * G + dN1 * S);
            rP[1] -= W * (N2 * G + dN2 * S);
            rP[2] -= W * (N3 * G + dN3 * S);
            rEta[0] += W * dM1 * Pq;
            rEta[1] += W * dM2 * Pq;
        }

        // The rate of a prescribed generation flux, through A without its
        // porosity factor.
        const BoundaryNode* gen[2] = {genA, genB};
        for (int k = 0; k < 2; ++k) {
            if (gen[k] == nullptr) continue;
            double qdot = dt > 0.0 ? (gen[k]->Value[0] - gen[k]->Value[1]) / dt : 0.0;
            if (k == 1) qdot = -qdot;
            const double dxc = dx * c2;
            for (int32_t q = 1; q <= G; ++q) {
                const double W = r.w[q] * J;
                const double dq = r.M[1][q] * d[i] + r.M[2][q] * d[j];
                const double Nk = r.N[k + 1][q], dNk = r.dN[k + 1][q] / J;
                for (int m = 0; m < 3; ++m) {
                    const double Nm = r.N[m + 1][q], dNm = r.dN[m + 1][q] / J;
                    rP[m] -= qdot * W * (Nk * Nm + phi * dq * dNk * (dxc * Nm + c1 * dq * dNm));
                }
            }
        }

        dP[v[0]] += rP[0];
        dP[v[1]] += rP[1];
        dP[v[2]] += rP[2];
        dEta[i] += rEta[0];
        dEta[j] += rEta[1];
    }
}

}  // namespace

void CalcElementRhsBW(double t, const std::vector<double>& y, BwModel& model,
                      std::vector<double>& ydot) {
    const Mesh& vm = gMeshes.meshes[model.VelocityMesh];
    const Mesh& em = gMeshes.meshes[model.ElevationMesh];
    LineRule r;
    LoadRule(&vm, em, r);
    std::fill(ydot.begin(), ydot.end(), 0.0);
    if (r.G == 3)
        ElementSums<3>(t, y, model, ydot, r);
    else
        ElementSums<0>(t, y, model, ydot, r);

    const double* P = y.data();
    double* dEta = ydot.data() + model.ElevationStart - 1;
    const double* b = model.SlotWidth.data();
    const double dt = model.TimeStep;
    const BoundarySet& vset = model.VelocitySet;

    // Continuity at boundary nodes: a wall or a prescribed flux enters
    // through its value; a generation node gets Q from each side.
    for (int32_t e = 1; e <= vm.ElementCount; ++e) {
        if (vm.ElementActive[e] == 0) continue;
        for (int32_t k = 1; k <= 2; ++k) {
            const int32_t node = GetElementNode(vm, e, k);
            const BoundaryNode* rec = RecordAt(vset, node);
            if (rec == nullptr) continue;
            const double s = k == 1 ? -1.0 : 1.0;
            double value = 0.0;
            if (rec->nodeType >= kNodeWallFlux && rec->nodeType <= kNodeFlux)
                value = s * P[node];
            else if (rec->nodeType == kNodeGeneration)
                value = -BoundaryValueAt(*rec, vset, t, dt);
            dEta[GetElementNode(em, e, k)] -= value;
        }
    }

    for (int32_t i = 1; i <= em.NodeCount; ++i) dEta[i] /= b[i];
}

void CalcRhsBW(double t, double stageStep, const std::vector<double>& y, std::vector<double>& ydot,
               BwModel& model, int32_t& status) {
    (void)stageStep;
    status = 0;
    int32_t flag = 2;
    if (!model.matricesBuilt || model.typeOfSupg == 2) {
        CalcMatricesBW(model);
        flag = 1;
    }
    CalcElementRhsBW(t, y, model, ydot);

    const double dt = model.TimeStep;
    for (const BoundaryNode& rec : model.VelocitySet.records) {
        const double change = dt > 0.0 ? (rec.Value[0] - rec.Value[1]) / dt : 0.0;
        if (rec.nodeType == kNodeFlux)
            ydot[rec.node] = -rec.direction[0] * change;
        else if (rec.nodeType == kNodeWallFlux)
            ydot[rec.node] = change;
    }

    StartTask(model, 4);
    const int32_t nu = model.ElevationStart - 1;
    const int32_t ne = model.StateSize - nu;
    double* work = model.Les.work1.data();
    int32_t info = 0;
    std::copy(ydot.begin() + 1, ydot.begin() + 1 + nu, work + 1);
    SolveBGE(model.Les.FluxMatrix, work + 1, ydot.data() + 1, flag, info);
    std::copy(ydot.begin() + model.ElevationStart, ydot.begin() + model.ElevationStart + ne,
              work + 1);
    SolveBGE(model.Les.ElevationMatrix, work + 1, ydot.data() + model.ElevationStart, flag, info);
    StopTask(model, 4);

    std::copy(ydot.begin() + model.ElevationStart, ydot.begin() + model.ElevationStart + ne,
              model.ElevationRate.begin() + 1);
}

void UpdateStageBW(double t, double stageStep, std::vector<double>& y, BwModel& model,
                   int32_t& status) {
    status = 0;
    const BoundarySet& vset = model.VelocitySet;
    for (const BoundaryNode& rec : vset.records) {
        if (rec.nodeType == kNodeFlux)
            y[rec.node] = -rec.direction[0] * BoundaryValueAt(rec, vset, t, model.TimeStep);
        else if (rec.nodeType == kNodeWallFlux)
            y[rec.node] = BoundaryValueAt(rec, vset, t, model.TimeStep);
    }

    if (model.Formulation == 2) {
        int32_t flag = 2;
        if (!model.auxMatrixBuilt) {
            CalcAuxMatrixBW(model);
            flag = 1;
        }
        std::vector<double>& rhs = model.Les.work2;
        CalcAuxRhsBW(t, y, model, rhs);
        int32_t info = 0;
        SolveBGE(model.Les.AuxMatrix, rhs.data() + 1, model.AuxVariable.data() + 1, flag, info);
    }

    if (model.spongeType > 0) ApplySpongeBW(model, y);
    if (model.filterType > 0) ApplyFilterBW(model, y);

    const int32_t nu = model.ElevationStart - 1;
    const int32_t ne = model.StateSize - nu;
    const double* eta = y.data() + nu;  // eta[1] is the first elevation node
    SetDepthBW(ne, model.TotalDepth, model.StillDepth, eta, model.SlotWidth, model.Slot, status);
    if (status < 0) return;

    std::copy(y.begin() + 1, y.begin() + 1 + nu, model.Flux.begin() + 1);
    std::copy(y.begin() + model.ElevationStart, y.begin() + model.ElevationStart + ne,
              model.Elevation.begin() + 1);

    // The rollers of this stage, from the surface just set; the angles
    // relax from those of the last step by the stage step.
    if (model.Breaking.type > 0)
        CalcBreakingBW(model.Breaking, gMeshes.meshes[model.GeometryMesh], stageStep,
                       model.Elevation.data(), model.ElevationRate.data(), model.StillDepth,
                       model.TotalDepth);
}

void CalcAuxMatrixBW(BwModel& model) {
    const Mesh& am = gMeshes.meshes[model.AuxMesh];
    BandMatrix& C = model.Les.AuxMatrix.Matrix;
    ClearBandMatrix(C);
    LineRule r;
    LoadRule(nullptr, am, r);
    for (int32_t e = 1; e <= am.ElementCount; ++e) {
        if (am.ElementActive[e] == 0) continue;
        const int32_t nodes[2] = {GetElementNode(am, e, 1), GetElementNode(am, e, 2)};
        const double J = 0.5 * am.ElementLength[e];
        double c[2][2] = {};
        for (int32_t q = 1; q <= r.G; ++q) {
            const double W = r.w[q] * J;
            const double M[2] = {r.M[1][q], r.M[2][q]};
            for (int p = 0; p < 2; ++p)
                for (int s = 0; s < 2; ++s) c[p][s] += W * M[p] * M[s];
        }
        for (int p = 0; p < 2; ++p)
            for (int s = 0; s < 2; ++s) AddBandEntry(C, nodes[p], nodes[s], c[p][s]);
    }
    model.auxMatrixBuilt = true;
}

void CalcAuxRhsBW(double t, const std::vector<double>& y, BwModel& model,
                  std::vector<double>& rhs) {
    const Mesh& am = gMeshes.meshes[model.AuxMesh];
    const double* d = model.StillDepth.data();
    const double* eta = y.data() + model.ElevationStart - 1;
    std::fill(rhs.begin(), rhs.end(), 0.0);
    for (int32_t e = 1; e <= am.ElementCount; ++e) {
        if (am.ElementActive[e] == 0) continue;
        const int32_t i = GetElementNode(am, e, 1), j = GetElementNode(am, e, 2);
        if (!(d[i] > 0.0 && d[j] > 0.0)) continue;
        const double flux = 0.5 * (d[i] + d[j]) * (eta[j] - eta[i]) / am.ElementLength[e];
        rhs[i] += flux;
        rhs[j] -= flux;
    }
    const BoundarySet& aset = model.AuxSet;
    if (aset.records.empty()) return;
    for (int32_t e = 1; e <= am.ElementCount; ++e) {
        if (am.ElementActive[e] == 0) continue;
        for (int32_t k = 1; k <= 2; ++k) {
            const int32_t node = GetElementNode(am, e, k);
            const BoundaryNode* rec = RecordAt(aset, node);
            if (rec == nullptr || !(d[node] > 0.0)) continue;
            rhs[node] -= d[node] * BoundaryValueAt(*rec, aset, t, model.TimeStep);
        }
    }
}
