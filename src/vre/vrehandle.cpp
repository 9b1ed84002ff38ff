// VRE files: the handle and its items — unit handling of an item, the index
// tables of the vector items and size parameters, and the element-count rules
// that tie the item lengths to the size parameters.
#include <algorithm>
#include <array>
#include <cstdint>

#include "qty/qty.h"
#include "vre/vre_internal.h"

namespace {

constexpr double kDeleteValue = VRE_DELETE_VALUE;

std::int32_t firstUnitOf(std::int32_t key) {
    std::int32_t unit = 0;
    const char* text = nullptr;
    qtyGetItemUnitSeq(key, 1, &unit, &text);
    return unit;
}

using Handle = CVreHandle;

constexpr std::array<Handle::DoubleItem Handle::*, VRE_VECTOR_ITEMS> kVectorItems = {
    &Handle::item0,  &Handle::item1,  &Handle::item2,  &Handle::item3,  &Handle::item4,  &Handle::item5,
    &Handle::item6,  &Handle::item7,  &Handle::item8,  &Handle::item9,  &Handle::item10, &Handle::item11,
    &Handle::item12, &Handle::item13, &Handle::item14, &Handle::item15, &Handle::item16, &Handle::item17,
    &Handle::item18, &Handle::item19, &Handle::item20, &Handle::item21, &Handle::item22};

constexpr std::array<std::int32_t Handle::*, VRE_SIZE_PARAMS> kParams = {
    &Handle::n0, &Handle::bodies, &Handle::panelTotal, &Handle::n3,
    &Handle::n4, &Handle::n5,     &Handle::n6,         &Handle::n7};

// Element count of a vector item: a constant times up to three size
// parameters (given by index; -1 ends the list).
struct Shape {
    std::int64_t constant;
    std::array<std::int8_t, 3> params;
};
constexpr std::int8_t N0 = 0, B = 1, P = 2, N3 = 3, N4 = 4, N7 = 7, NONE = -1;
constexpr std::array<Shape, VRE_VECTOR_ITEMS> kShapes = {{
    {12, {N0, NONE, NONE}},  // 0
    {3, {P, NONE, NONE}},    // 1
    {1, {P, NONE, NONE}},    // 2
    {3, {P, NONE, NONE}},    // 3
    {1, {P, N3, NONE}},      // 4
    {3, {B, NONE, NONE}},    // 5
    {3, {B, NONE, NONE}},    // 6
    {1, {B, NONE, NONE}},    // 7
    {1, {N3, N3, NONE}},     // 8
    {1, {N4, NONE, NONE}},   // 9
    {1, {N4, NONE, NONE}},   // 10
    {9, {B, NONE, NONE}},    // 11
    {1, {P, N4, N3}},        // 12
    {1, {P, N4, N3}},        // 13
    {1, {N4, N3, N3}},       // 14
    {1, {N4, N3, N3}},       // 15
    {1, {B, NONE, NONE}},    // 16
    {1, {B, NONE, NONE}},    // 17
    {1, {B, NONE, NONE}},    // 18
    {1, {B, NONE, NONE}},    // 19
    {1, {B, NONE, NONE}},    // 20
    {1, {N7, NONE, NONE}},   // 21
    {1, {N7, N4, N3}},       // 22
}};

}  // namespace

// ---- CItem ------------------------------------------------------------------

CVreHandle::CItem::CItem(std::int32_t itemKey) : key(itemKey), unit(firstUnitOf(itemKey)), userUnit(unit) {}

std::int32_t CVreHandle::CItem::baseUnit() const { return firstUnitOf(key); }

std::int32_t CVreHandle::CItem::setStorageUnit(std::int32_t newUnit) {
    if (!qtyItemUnitEqv(key, newUnit)) return F_ERR_UNIT;
    unit = newUnit;
    return F_NO_ERROR;
}

std::int32_t CVreHandle::CItem::setConversion(std::int32_t newMode, std::int32_t newUserUnit) {
    mode = newMode;
    if (!qtyItemUnitEqv(key, newUserUnit)) return F_ERR_UNIT;
    userUnit = newUserUnit;
    return F_NO_ERROR;
}

// A failed conversion leaves the value as it was (the unit library does not
// touch its output on failure).
double CVreHandle::CItem::toCaller(double value) const {
    double out = value;
    switch (mode) {
        case VRE_CONVERT_USER: qtyConvertToUserUnit(key, unit, value, &out); break;
        case VRE_CONVERT_EXPLICIT: qtyConvertUnit(unit, value, userUnit, &out); break;
        case VRE_CONVERT_BASE: qtyConvertUnit(unit, value, baseUnit(), &out); break;
        default: break;
    }
    return out;
}

double CVreHandle::CItem::fromCaller(double value) const {
    double out = value;
    switch (mode) {
        case VRE_CONVERT_USER: qtyConvertFromUserUnit(key, unit, value, &out); break;
        case VRE_CONVERT_EXPLICIT: qtyConvertUnit(userUnit, value, unit, &out); break;
        case VRE_CONVERT_BASE: qtyConvertUnit(baseUnit(), value, unit, &out); break;
        default: break;
    }
    return out;
}

void CVreHandle::CItem::toCaller(double* values, std::int32_t count) const {
    if (count <= 0) return;
    switch (mode) {
        case VRE_CONVERT_USER: qtyConvertItemArrayToUserUnitD(key, unit, values, count, kDeleteValue); break;
        case VRE_CONVERT_EXPLICIT: qtyConvertItemArrayD(unit, userUnit, values, count, kDeleteValue); break;
        case VRE_CONVERT_BASE: qtyConvertItemArrayD(unit, baseUnit(), values, count, kDeleteValue); break;
        default: break;
    }
}

void CVreHandle::CItem::fromCaller(double* values, std::int32_t count) const {
    if (count <= 0) return;
    switch (mode) {
        case VRE_CONVERT_USER: qtyConvertItemArrayFromUserUnitD(key, unit, values, count, kDeleteValue); break;
        case VRE_CONVERT_EXPLICIT: qtyConvertItemArrayD(userUnit, unit, values, count, kDeleteValue); break;
        case VRE_CONVERT_BASE: qtyConvertItemArrayD(baseUnit(), unit, values, count, kDeleteValue); break;
        default: break;
    }
}

// ---- CVreHandle ---------------------------------------------------------------

CVreHandle::CVreHandle() = default;

CVreHandle::DoubleItem* CVreHandle::vectorItem(std::int32_t index) {
    if (index < 0 || index >= VRE_VECTOR_ITEMS) return nullptr;
    return &(this->*kVectorItems[static_cast<std::size_t>(index)]);
}

CVreHandle::CScalarItem* CVreHandle::scalarItem(std::int32_t index) {
    if (index == 0) return &scalar0;
    if (index == 1) return &scalar1;
    return nullptr;
}

std::int32_t* CVreHandle::param(std::int32_t index) {
    if (index < 0 || index >= VRE_SIZE_PARAMS) return nullptr;
    return &(this->*kParams[static_cast<std::size_t>(index)]);
}

std::int64_t CVreHandle::elementCount(std::int32_t index) const {
    if (index < 0 || index >= VRE_VECTOR_ITEMS) return -1;
    const Shape& shape = kShapes[static_cast<std::size_t>(index)];
    std::int64_t factors[4] = {shape.constant, 1, 1, 1};
    for (std::size_t i = 0; i < shape.params.size() && shape.params[i] != NONE; ++i) {
        factors[i + 1] = this->*kParams[static_cast<std::size_t>(shape.params[i])];
    }
    // Any factor of 0 makes an empty item, however large the others are.
    for (std::int64_t f : factors) {
        if (f < 0) return -1;
        if (f == 0) return 0;
    }
    // Each factor is below 2^31 and the running product is kept at most
    // kMaxElements, so no step overflows 64 bits.
    std::int64_t product = 1;
    for (std::int64_t f : factors) {
        product *= f;
        if (product > kMaxElements) return -1;
    }
    return product;
}

std::int64_t CVreHandle::bodyCount() const { return bodies < 0 ? -1 : bodies; }

std::int64_t CVreHandle::nameCount() const {
    return bodies < 0 || std::int64_t{bodies} * VRE_NAME_LENGTH > kMaxElements ? -1 : bodies;
}

void CVreHandle::recomputePanelTotal() {
    std::int64_t sum = 0;
    if (panelCounts.hasBuffer() && bodies > 0) {
        const std::int32_t n = std::min(bodies, panelCounts.size());
        const std::int32_t* counts = panelCounts.data();
        for (std::int32_t i = 0; i < n; ++i) sum += counts[i];
    }
    panelTotal = static_cast<std::int32_t>(std::clamp<std::int64_t>(sum, INT32_MIN, INT32_MAX));
}
