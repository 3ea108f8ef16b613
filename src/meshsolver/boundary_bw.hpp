// The boundary data of the 1DH model: the codes of the mesh's boundary nodes
// with their kind (wall, flux, internal generation) and where their values
// come from, the three boundary sets (velocity, elevation, auxiliary) the
// equations read, and the step-by-step update of the values with soft start.
#pragma once

#include <cstdint>

#include "meshsolver/bw_model.hpp"

// BOUNDARY_CONDITIONS of the open BOUSSINESQ_WAVE_MODULE section: a section
// CODE_n for every code present on the geometry mesh, and the three sets.
// The series of a code come from its file, their times counted from the
// start of the run (gMeshRun).
void SetupBoundCondBW(BwModel& model);
// Moves the values of every code one step on, to time t (seconds from the
// start): Value[1] = Value[0], Value[0] = the value at t.
void UpdateForcingsBW(double t, BwModel& model);

// The two values of a code's data at time t: the constant or the series
// value ramped up from the reference values by the soft start factor, or
// the sine of format 5.
void DataInputValues(const DataInput& data, double t, double values[2]);
// 1 without soft start (type 0, T <= 0 or t > T); t / T (type 1);
// (1 + sin((t / T - 1/2) pi)) / 2 (type 2).
double SoftStartFactor(int32_t type, double T, double t);
// Component 0 or 1 of a series, linear in time between its records and
// held beyond its ends.
double SeriesValueAt(const DataInput& data, int component, double t);
