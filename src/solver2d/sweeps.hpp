// The sweeps of the alternating-direction scheme. XSweep/YSweep: central
// convection, side-feeding of the neighbouring lines, a double sweep along
// each chain, open boundaries. XSweep_New/YSweep_New: upwind forms of the
// convective terms chosen by Convective_terms_handle, land and internal
// generation at the rim only.
#pragma once

#include <cstdint>
#include <string>

// Chooses sweepMode and lineBufferMode and makes the coefficient buffers.
void SetupSweepBuffers();
void XSweep(bool lineOrderFlag, int32_t step);
void YSweep(bool lineOrderFlag, int32_t step);
void XSweep_New(bool lineOrderFlag, int32_t step);
void YSweep_New(bool lineOrderFlag, int32_t step);
// Writes the boundary values into the extrapolated surface before a sweep.
void SetBoundarySurface(int32_t axis, float* xiExt);
// The stop of a sweep: the text with its two numbers in the log, the outputs
// closed, exit code -1. Never returns.
[[noreturn]] void BlowUp(const std::string& text, int32_t i, int32_t j);
