// The output of the mesh solver: each section OUTPUT_FILE_% of its file is
// one record of one of three kinds, the state of the nodes at points or
// along a line (type 1), the wave statistics (type 2) or the runup, where
// the water line crosses the bed (type 3). The driver calls WriteOutputHD3D
// with the start state, after each step and, when a run ends early, once
// more with step -1; each call refreshes the work vectors, feeds the
// statistics and writes the records that are due.
#pragma once

#include <cstdint>
#include <vector>

#include "mesh/output_domain.hpp"
#include "meshsolver/bw_model.hpp"
#include "output/deterministic.hpp"

struct OutputListBW {
    int32_t count = 0;
    std::vector<OutputFile> files;
    // The first crossing of the run, from which the total runup is measured.
    bool runupReferenceSet = false;
    double runupX0 = 0.0, runupZ0 = 0.0;
};
extern OutputListBW gOutputBW;

// The item tables, item n at index n - 1.
extern const OutputItemInfo kStandardItemsBW[14];
extern const OutputItemInfo kPhaseAverageItemsBW[19];
extern const OutputItemInfo kRunupItemsBW[3];

void ResetOutputBW();
// OUTPUT of the open BOUSSINESQ_WAVE_MODULE section: the statistics
// settings and the records with their items and places.
void SetupOutputBW(BwModel& model);
void SpecStandardBW(OutputFile& record, BwModel& model);
void SpecPhaseAverageBW(OutputFile& record, BwModel& model);
void SpecRunupBW(OutputFile& record, BwModel& model);

// Work vectors, statistics, and every record due at step (-1: all of them).
void WriteOutputHD3D(int32_t step, int32_t count, std::vector<OutputFile>& records, BwModel& model);
void RefreshWorkVectorsBW(BwModel& model);
void WriteStandardBW(OutputFile& record);
void WritePhaseAverageBW(int32_t step, OutputFile& record, BwModel& model);
void WriteRunupBW(OutputFile& record, BwModel& model);

// Where the water line meets the bed: the first pair of neighbouring nodes
// i, i + 1 whose water depths eta + d have no common sign; xr is where the
// linear depth between them vanishes, zr the bed level there. False when
// there is no such pair (or fewer than two nodes).
bool FindRunupCrossing(const Mesh& mesh, const std::vector<double>& eta,
                       const std::vector<double>& stillDepth, double& xr, double& zr);
