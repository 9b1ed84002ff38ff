// Unit library, internal interface: table look-ups, the affine map between two
// units, the in-place array kernels and the process-wide user units.
#pragma once

#include <cstdint>

#include "qty/qty_model.h"

namespace qty {

// ---- Look-ups (null when absent) -------------------------------------------------

const Unit* findUnit(int32_t key) noexcept;
const Quantity* findQuantity(int32_t key) noexcept;
// Exact symbol or one of its listed spellings, surrounding blanks ignored.
const Unit* findUnitByText(const char* text) noexcept;
// Exact text key, else the one key that matches ignoring case.
const Quantity* findQuantityByText(const char* text) noexcept;

// The undefined quantity takes every unit; any other takes the units of its
// dimension.
bool unitFitsQuantity(const Quantity& q, const Unit& u) noexcept;

// ---- Conversion ------------------------------------------------------------------

// to = from * scale + offset.
struct Affine {
    double scale = 1.0;
    double offset = 0.0;
};

// The map from one unit to another; false when their dimensions differ.
// exact (optional) tells whether scale and offset were rounded from the exact
// ratios of the two definitions (false only where a 64-bit intermediate would
// overflow, and double arithmetic on the rounded definitions is used).
bool affineBetween(const Unit& from, const Unit& to, Affine& map, bool* exact = nullptr) noexcept;

inline double applyAffine(double v, const Affine& m) noexcept {
    return m.offset == 0.0 ? v * m.scale : v * m.scale + m.offset;
}

// In place; elements equal to deleteValue stay as they are. Float elements are
// converted in double precision and rounded once.
void convertArray(double* values, int32_t count, double deleteValue, const Affine& m) noexcept;
void convertArray(float* values, int32_t count, float deleteValue, const Affine& m) noexcept;

// ---- User units ------------------------------------------------------------------

// The quantity's user unit: the first of its sequence until one is set.
const Unit& userUnit(const Quantity& q) noexcept;
void setUserUnit(const Quantity& q, const Unit& u) noexcept;

}  // namespace qty
