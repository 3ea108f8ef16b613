// Hot-start output: the whole state of the 2DH model at one step, written as
// one map file of 18 items that a later run reads to go on from that instant
// (Bathymetry_Selection with Hot_Start on). The file is written anew at each
// due step, so the last due step is what stays on disk.
#pragma once

#include <cstdint>

#include "output/output_sections.hpp"

// Writes the file for step n when n is due (First_Time_Step <= n <=
// Last_Time_Step, on the interval). Called with 0 before the first step and
// after every step, last of the step's outputs.
void WriteOutputHotstart(int32_t step);
