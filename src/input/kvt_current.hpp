// Parameter access layer, current-section face: the layer keeps one file and
// one current node, so that a reader walks a file by opening and closing
// sections by name, as the mesh solver reads its own parameter file. The rules
// of defaults, echo and status are those of the explicit face.
#pragma once

#include <climits>
#include <cstdint>
#include <string>
#include <string_view>

#include "input/kvt_access.hpp"

constexpr int kKvtNoNumber = INT_MIN;  // "no number given" for a numbered section

// Sets the file of this face; the caller opens it with KvtOpenFile, without a log.
void KvtUseFile(KvtHandle file);
// Makes a target current. Without an instance the one given last is used (first: 1).
void KvtOpenTarget(std::string_view name, int instance = 0, int* status = nullptr);
// Makes a child section of the current node current, instance 1. With a
// number of 0 or more its name is name + "_" + number, with a negative one
// name + "_M" + |number|. On failure the current node stays.
void KvtOpenSection(std::string_view name, int number = kKvtNoNumber, int* status = nullptr);
// Makes the parent of the current node current, found again by its path from the target.
void KvtCloseSection();
// The name of a numbered section.
std::string NumberedSectionName(std::string_view name, int number);

// Getters: a given default is first copied into value.
void KvtGetDouble(std::string_view key, double& value, int instance = 1, int param = 1,
                  const double* fallback = nullptr, int* status = nullptr);
void KvtGetReal(std::string_view key, float& value, int instance = 1, int param = 1,
                const float* fallback = nullptr, int* status = nullptr);
void KvtGetInteger(std::string_view key, int32_t& value, int instance = 1, int param = 1,
                   const int32_t* fallback = nullptr, int* status = nullptr);
void KvtGetLogical(std::string_view key, bool& value, int instance = 1, int param = 1,
                   const bool* fallback = nullptr, int* status = nullptr);
void KvtGetString(std::string_view key, std::string& value, int instance = 1, int param = 1,
                  const std::string* fallback = nullptr, int* status = nullptr);
void KvtGetFilename(std::string_view key, std::string& value, int instance = 1, int param = 1,
                    const std::string* fallback = nullptr, int* status = nullptr);
void KvtGetIntegerList(std::string_view key, int32_t* values, int count, int* status = nullptr);
void KvtGetDoubleList(std::string_view key, double* values, int count, int* status = nullptr);
