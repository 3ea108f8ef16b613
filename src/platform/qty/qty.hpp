// Item types and units of data files.
//
// An item type says what a quantity is (surface elevation, flux, wave
// height); a unit says in what it is measured. Each type has a sequence of
// units it may be given in; the first is its base unit, in which the engine
// computes. Units of one dimension convert into each other. Type 999 is an
// undefined quantity, in whatever unit its file gives.
#pragma once

#include <string>

constexpr int kTypeUndefined = 999;
constexpr int kUnitNone = 0;
constexpr int kUnitMetre = 1000;
constexpr int kUnitSecond = 1400;
constexpr int kUnitMetrePerSecond = 2000;
constexpr int kUnitCubicMetrePerSecondPerMetre = 4700;
constexpr int kUnitDimensionless = 99000;

// The name of an item type; false (and "Unknown") for a type not in the table.
bool qtyGetItemTypeKey(int type, std::string& text);
// The text of a unit code ("meter", "sec", ...); false (and "Unknown") when unknown.
bool qtyGetUnitKey(int unit, std::string& text);
// Unit number seq (from 1) of the type's sequence with its text; false past its end.
bool qtyGetItemUnitSeq(int type, int seq, int& unit, std::string& text);
// The unit in which users see the type (its base unit); false for an unknown type.
bool qtyGetItemUserUnit(int type, int& unit);
// True when the unit belongs to the type's sequence; any unit fits type 999.
bool qtyItemUnitEqv(int type, int unit);
// Converts value from one unit to another of the same dimension; false (value
// unchanged) when the units are unknown or of different dimensions.
bool qtyConvertUnit(int fromUnit, int toUnit, double& value);

// The unit as a CF/UDUNITS text ("m", "s", "m s-1", "m2 s-1", "1"); empty when unknown.
std::string qtyGetCfUnit(int unit);
// The unit code of a CF/UDUNITS text, or -1 when none matches.
int qtyUnitFromCf(const std::string& text);
