// Hot-start output: the whole state of the 2DH model at one step, written as
// one map file of 18 items that a later run reads to go on from that instant
// (Bathymetry_Selection with Hot_Start on). The file is written anew at each
// due step, so the last due step is what stays on disk.
//
// A state file must never be left half written: each one goes to a
// temporary name beside File_Name, is flushed to disk and then renamed over
// the former file in one step, so that a stop, a kill or a full disk during
// the write leaves the last good file in place.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "output/output_sections.hpp"

// The 18 items of a state file, in file order.
constexpr int32_t kHotstartItems = 18;
extern const OutputItemInfo kHotstartItemInfo[kHotstartItems];

// What the writer keeps from one due step to the next.
struct HotstartOutputState {
    std::vector<float> item;  // one item over the grid, built for the items 1 and 11 to 18
    bool locked = false;      // the file's lock is taken (output_lock.hpp)
};
extern HotstartOutputState gHotstartState;

// The name the file is written under before it replaces File_Name.
std::string HotstartTemporaryName(const std::string& fileName);

// Writes the file for step n when n is due (First_Time_Step <= n <=
// Last_Time_Step, on the interval; an interval below 1 writes the first step
// only). Called with 0 before the first step and after every step, last of
// the step's outputs. A failed write removes the temporary file and stops the
// run with the data layer's message; the former file stays as it was.
void WriteOutputHotstart(int32_t step);
