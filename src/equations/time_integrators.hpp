// The time integrators of the mesh solver: TG3, an explicit three-stage
// scheme (method 1, the default of a model file), and ABM, an
// Adams-Bashforth-Moulton predictor-corrector (method 2). Both drive the
// model through its right-hand side (CalcRhsBW) and its stage update
// (UpdateStageBW) and keep no other knowledge of it.
#pragma once

#include <cstdint>
#include <vector>

#include "meshsolver/bw_model.hpp"

// f: ydot from y at time t; g: boundary values, filters and depth into y
// after a stage. Both take the stage step and set status (negative: the
// step ends).
using DaeRhsFunction = void (*)(double t, double stageStep, const std::vector<double>& y,
                                std::vector<double>& ydot, BwModel& model, int32_t& status);
using DaeStageFunction = void (*)(double t, double stageStep, std::vector<double>& y,
                                  BwModel& model, int32_t& status);

// Allocates y and ydot, copies Flux and Elevation into y, reads
// DIFFERENTIAL_ALGEBRAIC_EQUATION_SYSTEM of the open SOLUTION_TECHNIQUE
// section and sets up the method.
void SetupDaesBW(BwModel& model);
// The method's own setup by DaeMethod: 1 TG3, 2 ABM, any other stops the run.
void SetupDaes(BwModel& model);
void SetupTG3(BwModel& model);
// Reads the keys of ABM in the open section and allocates the histories.
void SetupABM(BwModel& model);
// One step of the model ending at time t; status -1 after a blow-up in a stage.
void SolveTimeStepBW(double t, BwModel& model, int32_t& status);

// One step of length h ending at t, from y (1..StateSize) with the work
// vector ydot; status -1 when a stage update reported a failure.
void TG3(BwModel& model, double t, double h, std::vector<double>& y, std::vector<double>& ydot,
         DaeRhsFunction f, DaeStageFunction g, int32_t& status);
void ABM(BwModel& model, double t, double h, std::vector<double>& y, std::vector<double>& ydot,
         DaeRhsFunction f, DaeStageFunction g, int32_t& status);
