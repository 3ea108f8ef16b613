// What the machine can hold: counts and sizes read from model and data files
// are weighed against it before anything is allocated, so that a count that
// no machine could hold stops the run at once with the number that was asked
// for, rather than failing deep inside an allocation or swapping for minutes.
#pragma once

#include <cstdint>
#include <string_view>

// The bytes this process may use: the machine's physical memory, or the
// process's address-space or data limit where that is lower.
uint64_t MachineMemoryBytes();

// Stops the run with "Unable to allocate memory" and what was asked for, when
// count items of itemBytes each exceed the machine's memory. what names the
// request ("the grid of 3000000000 x 2 points", "Number_Of_Records = 2147483647").
void CheckMemory(std::string_view what, double count, double itemBytes);
