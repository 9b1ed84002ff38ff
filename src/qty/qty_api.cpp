// Unit library, exported C interface. Every call returns non-zero on success
// and writes its outputs only then. Nothing here allocates or throws.
#include "qty/qty.h"

#include "qty/qty_internal.h"
#include "qty/qty_tables.h"

using namespace qty;

namespace {

// The map between a unit and the user unit of a quantity type, in the given
// direction. The unit must belong to the quantity. While the undefined
// quantity has no user unit chosen, values stay in their own unit.
bool userUnitMap(int32_t itemType, int32_t unit, bool toUser, Affine& map) noexcept {
    const Quantity* q = findQuantity(itemType);
    const Unit* u = findUnit(unit);
    if (q == nullptr || u == nullptr || !unitFitsQuantity(*q, *u)) return false;
    const Unit& user = userUnit(*q);
    if (user.key == QTY_UNIT_UNDEFINED) {
        map = Affine{};
        return true;
    }
    return toUser ? affineBetween(*u, user, map) : affineBetween(user, *u, map);
}

bool unitMap(int32_t fromUnit, int32_t toUnit, Affine& map) noexcept {
    const Unit* from = findUnit(fromUnit);
    const Unit* to = findUnit(toUnit);
    return from != nullptr && to != nullptr && affineBetween(*from, *to, map);
}

int convertValue(bool found, const Affine& map, double value, double* out) noexcept {
    if (!found || out == nullptr) return 0;
    *out = applyAffine(value, map);
    return 1;
}

template <class T>
int convertValues(bool found, const Affine& map, T* array, int32_t count, T deleteValue) noexcept {
    if (!found || count < 0 || (array == nullptr && count > 0)) return 0;
    convertArray(array, count, deleteValue, map);
    return 1;
}

template <class T>
void give(T* out, T value) noexcept {
    if (out != nullptr) *out = value;
}

int giveQuantity(const Quantity* q, int32_t* key, const char** text, const char** description) noexcept {
    if (q == nullptr) return 0;
    give(key, q->key);
    give(text, q->text);
    give(description, q->description);
    return 1;
}

int giveUnit(const Unit* u, int32_t* key, const char** text, const char** description) noexcept {
    if (u == nullptr) return 0;
    give(key, u->key);
    give(text, u->text);
    give(description, u->description);
    return 1;
}

}  // namespace

extern "C" {

QTY_API int QTY_CALL qtyItemUnitEqv(int32_t itemType, int32_t unit) {
    const Quantity* q = findQuantity(itemType);
    const Unit* u = findUnit(unit);
    return q != nullptr && u != nullptr && unitFitsQuantity(*q, *u) ? 1 : 0;
}

QTY_API int QTY_CALL qtyGetItemTypeKey(int32_t itemType, const char** text) {
    return giveQuantity(findQuantity(itemType), nullptr, text, nullptr);
}

QTY_API int QTY_CALL qtyGetUnitKey(int32_t unit, const char** text) {
    return giveUnit(findUnit(unit), nullptr, text, nullptr);
}

QTY_API int QTY_CALL qtyGetUnitTag(const char* unitText, int32_t* unit) {
    return giveUnit(findUnitByText(unitText), unit, nullptr, nullptr);
}

QTY_API int QTY_CALL qtyGetItemUnitSeq(int32_t itemType, int32_t sequenceNo, int32_t* unit, const char** unitText) {
    const Quantity* q = findQuantity(itemType);
    if (q == nullptr || sequenceNo < 1 || static_cast<size_t>(sequenceNo) > q->units.size()) return 0;
    return giveUnit(findUnit(q->units[static_cast<size_t>(sequenceNo) - 1]), unit, unitText, nullptr);
}

QTY_API int QTY_CALL qtyConvertUnit(int32_t fromUnit, double value, int32_t toUnit, double* out) {
    Affine map;
    return convertValue(unitMap(fromUnit, toUnit, map), map, value, out);
}

QTY_API int QTY_CALL qtyConvertToUserUnit(int32_t itemType, int32_t unit, double value, double* out) {
    Affine map;
    return convertValue(userUnitMap(itemType, unit, true, map), map, value, out);
}

QTY_API int QTY_CALL qtyConvertFromUserUnit(int32_t itemType, int32_t unit, double value, double* out) {
    Affine map;
    return convertValue(userUnitMap(itemType, unit, false, map), map, value, out);
}

QTY_API int QTY_CALL qtyConvertItemArrayD(int32_t fromUnit, int32_t toUnit, double* array, int32_t count,
                                          double deleteValue) {
    Affine map;
    return convertValues(unitMap(fromUnit, toUnit, map), map, array, count, deleteValue);
}

QTY_API int QTY_CALL qtyConvertItemArrayF(int32_t fromUnit, int32_t toUnit, float* array, int32_t count,
                                          float deleteValue) {
    Affine map;
    return convertValues(unitMap(fromUnit, toUnit, map), map, array, count, deleteValue);
}

QTY_API int QTY_CALL qtyConvertItemArrayToUserUnitD(int32_t itemType, int32_t unit, double* array, int32_t count,
                                                    double deleteValue) {
    Affine map;
    return convertValues(userUnitMap(itemType, unit, true, map), map, array, count, deleteValue);
}

QTY_API int QTY_CALL qtyConvertItemArrayToUserUnitF(int32_t itemType, int32_t unit, float* array, int32_t count,
                                                    float deleteValue) {
    Affine map;
    return convertValues(userUnitMap(itemType, unit, true, map), map, array, count, deleteValue);
}

QTY_API int QTY_CALL qtyConvertItemArrayFromUserUnitD(int32_t itemType, int32_t unit, double* array,
                                                      int32_t count, double deleteValue) {
    Affine map;
    return convertValues(userUnitMap(itemType, unit, false, map), map, array, count, deleteValue);
}

QTY_API int QTY_CALL qtyConvertItemArrayFromUserUnitF(int32_t itemType, int32_t unit, float* array,
                                                      int32_t count, float deleteValue) {
    Affine map;
    return convertValues(userUnitMap(itemType, unit, false, map), map, array, count, deleteValue);
}

QTY_API int QTY_CALL qtySetUserUnit(int32_t itemType, int32_t unit) {
    const Quantity* q = findQuantity(itemType);
    const Unit* u = findUnit(unit);
    if (q == nullptr || u == nullptr || !unitFitsQuantity(*q, *u)) return 0;
    setUserUnit(*q, *u);
    return 1;
}

QTY_API int QTY_CALL qtyGetUserUnit(int32_t itemType, int32_t* unit) {
    const Quantity* q = findQuantity(itemType);
    return q != nullptr ? giveUnit(&userUnit(*q), unit, nullptr, nullptr) : 0;
}

QTY_API int32_t QTY_CALL qtyGetItemTypeCount(void) { return kQuantityCount; }

QTY_API int QTY_CALL qtyGetItemTypeByIndex(int32_t index, int32_t* itemType, const char** text,
                                           const char** description) {
    if (index < 0 || index >= kQuantityCount) return 0;
    return giveQuantity(&kQuantities[index], itemType, text, description);
}

QTY_API int32_t QTY_CALL qtyGetItemUnitCount(int32_t itemType) {
    const Quantity* q = findQuantity(itemType);
    return q != nullptr ? static_cast<int32_t>(q->units.size()) : 0;
}

QTY_API int32_t QTY_CALL qtyGetUnitCount(void) { return kUnitCount; }

QTY_API int QTY_CALL qtyGetUnitByIndex(int32_t index, int32_t* unit, const char** text, const char** description) {
    if (index < 0 || index >= kUnitCount) return 0;
    return giveUnit(&kUnits[index], unit, text, description);
}

QTY_API int QTY_CALL qtyGetItemTypeDescription(int32_t itemType, const char** description) {
    return giveQuantity(findQuantity(itemType), nullptr, nullptr, description);
}

QTY_API int QTY_CALL qtyGetUnitDescription(int32_t unit, const char** description) {
    return giveUnit(findUnit(unit), nullptr, nullptr, description);
}

QTY_API int QTY_CALL qtyGetItemTypeTag(const char* itemTypeText, int32_t* itemType) {
    return giveQuantity(findQuantityByText(itemTypeText), itemType, nullptr, nullptr);
}

}  // extern "C"
