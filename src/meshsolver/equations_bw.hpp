// The semi-discrete equations of the 1DH Boussinesq model: quadratic flux P
// on the velocity mesh, linear surface eta on the elevation mesh, and the
// auxiliary variable e (the second derivative of the surface that the
// enhanced dispersion needs) on the auxiliary mesh. The time derivative of
// the state comes from the element sums and two band solves; the
// integrators (time_integrators.hpp) advance it.
#pragma once

#include <cstdint>
#include <vector>

#include "input/kvt_access.hpp"
#include "meshsolver/bw_model.hpp"

// Reads EQUATION, TIME and SPACE of the open BOUSSINESQ_WAVE_MODULE section
// (current-section face) and allocates the model's vectors on its meshes.
void SetupEquationBW(int32_t dimensions, BwModel& model);
// Reads SOLUTION_TECHNIQUE: SUPG settings, the integrator (SetupDaesBW) and
// the three banded systems.
void SetupSolutionBW(BwModel& model);

// The right-hand side of the integrator: ydot from y at time t (stage step
// given); status 0, negative when the step must end.
void CalcRhsBW(double t, double stageStep, const std::vector<double>& y, std::vector<double>& ydot,
               BwModel& model, int32_t& status);
// After each stage: boundary values into y, the auxiliary variable, the
// depth with its blow-up check (status -1), the copies Flux and Elevation.
void UpdateStageBW(double t, double stageStep, std::vector<double>& y, BwModel& model,
                   int32_t& status);

void CalcMatricesBW(BwModel& model);
void CalcElementRhsBW(double t, const std::vector<double>& y, BwModel& model,
                      std::vector<double>& ydot);
void CalcAuxMatrixBW(BwModel& model);
void CalcAuxRhsBW(double t, const std::vector<double>& y, BwModel& model, std::vector<double>& rhs);

// The value of a boundary record at a stage time t of the step that ends at
// the set's time: Q_new (1 - theta) + Q_old theta, theta = (t_end - t) / TimeStep.
double BoundaryValueAt(const BoundaryNode& record, const BoundarySet& set, double t,
                       double timeStep);
