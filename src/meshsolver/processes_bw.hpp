// The processes of the 1DH model that act on the nodes: the still water
// depth d and the total depth h = d + eta with its blow-up check, the slot
// that keeps a dry node wet (storage width b), and the start state.
// The sponge, the filter and the rollers read their sections and maps here
// and act after each stage of the integrator; bed resistance and porosity
// act in the element equations.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "meshsolver/bw_model.hpp"

// DEPTH, SLOT, BED_RESISTANCE, EDDY_VISCOSITY, POROSITY_LAYER, SPONGE_LAYER,
// WAVE_BREAKING, EXPLICIT_FILTERING of the open BOUSSINESQ_WAVE_MODULE section.
void SetupProcessesBW(BwModel& model);
// The total depth h = d + eta at each of the n nodes of the elevation mesh
// (eta[1..n]), the slot width b, and the blow-up check: status -1 with the
// report in the log at the first node of negative depth or of |eta| > 50.
void SetDepthBW(int32_t n, std::vector<double>& h, const std::vector<double>& d, const double* eta,
                std::vector<double>& b, const SlotSettingsBW& slot, int32_t& status);
// The mesh data reader: item `item` of a 1D data file on the nodes of the
// mesh (slot 0 unused). Stops with "Illegal data file" (not readable),
// "Wrong dimension", "Wrong data file" (other points or no such item) or
// "Error Reading data file".
std::vector<double> ReadNodeMapBW(const std::string& path, int32_t item, const Mesh& mesh);
// A map on the geometry mesh spread to the nodes of a target mesh with the
// same elements: the mean of the map over each element, averaged over the
// elements that share a target node.
std::vector<double> SpreadByElementsBW(const std::vector<double>& s, const Mesh& geometry,
                                       const Mesh& target);
// After a stage: P = P x factor on the velocity mesh; eta relaxed towards
// the first reference value on the first half of the nodes and towards the
// second on the rest, eta = (eta - ref) x factor + ref.
void ApplySpongeBW(const BwModel& model, std::vector<double>& y);
// After a stage, on the P block and then the eta block of y, along the node
// numbers: v = (1 - c) v + c f with the three-point mean f, the end values
// left as they are.
void ApplyFilterBW(const BwModel& model, std::vector<double>& y);

// The rollers of one stage, on the geometry mesh (eta, d and h on its
// nodes, 1-based): the angle of each roller relaxes from the value of the
// last step towards the final one with the stage step, and a toe is sought
// where the surface slope passes -tan(angle), from the right end down to
// node 100, for a wave that moves towards larger x. etaRate and h are not
// needed by the construction on the profile.
void CalcBreakingBW(BreakingStateBW& breaking, const Mesh& mesh, double stageStep,
                    const double* eta, const double* etaRate, const std::vector<double>& d,
                    const std::vector<double>& h);
// The end of a step: delta and the angles become the old ones.
void SaveBreakingBW(BreakingStateBW& breaking);
// STARTING_CONDITIONS and the start state: Flux, Elevation, depth.
void SetupInitCondBW(BwModel& model);

// The block "Simulation information" of the log: depth range, element
// lengths and the largest Courant number sqrt(g dmax) / L x timeStep.
void WriteSimulationInformation(const Mesh& mesh, const std::vector<double>& d, double timeStep);
// A number in the form 0.dddd E+xx, right-adjusted in width columns, with
// digits significant digits: the form of the blow-up report.
std::string ExponentField(double value, int width, int digits);
