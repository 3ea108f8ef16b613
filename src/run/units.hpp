// Unit table for text files. A unit is a small number that stands for an open
// text file (log, message file, reports), handed out by GetFreeUnit and freed
// by ReleaseUnit, so that every text file of a run is known in one place.
#pragma once

#include <cstdio>
#include <string>

constexpr int kUnitCount = 512;

// The lowest free unit from 1 to 512, or -1 when none is left. Units 5 and 6
// are reserved on first use.
int GetFreeUnit();
// Frees a unit (closing its file if one is open); a negative unit clears the table.
void ReleaseUnit(int unit);

// Opens path on the unit with an fopen mode; false if the file can't be opened.
bool OpenUnit(int unit, const std::string& path, const char* mode);
// The open file of a unit, or nullptr.
FILE* UnitFile(int unit);
// Closes the file of a unit and, with remove set, deletes it; the unit stays taken.
void CloseUnit(int unit, bool remove = false);
// Flushes every open unit (before the process ends).
void FlushUnits();
