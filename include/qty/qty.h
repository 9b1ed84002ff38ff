/*
 * qty — the unit-management library. Quantity types (water level, velocity,
 * temperature, ...) each have a dimension and an ordered sequence of units;
 * units carry an affine map to their coherent SI unit, so values convert
 * between any two units of one dimension. Each call returns non-zero on
 * success and leaves its outputs untouched on failure. Texts handed out are
 * static and never freed by callers. Thread-safe: the tables are immutable;
 * user units are guarded.
 */
#ifndef QTY_QTY_H
#define QTY_QTY_H

#include <stdint.h>

#if defined(_WIN32) && !defined(_WIN64)
#define QTY_CALL __stdcall
#else
#define QTY_CALL
#endif

#if defined(QTY_STATIC_DEFINE)
#define QTY_API
#elif defined(_WIN32)
#if defined(QTY_BUILDING)
#define QTY_API __declspec(dllexport)
#else
#define QTY_API __declspec(dllimport)
#endif
#else
#define QTY_API __attribute__((visibility("default")))
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* Fixed keys. */
#define QTY_ITEM_UNDEFINED 999      /* accepts unit 0 and any other unit */
#define QTY_UNIT_UNDEFINED 0
#define QTY_ITEM_GEOMETRY_0D 100185 /* 0-D .. 3-D geometry: lengths */
#define QTY_ITEM_GEOMETRY_1D 100186
#define QTY_ITEM_GEOMETRY_2D 100187
#define QTY_ITEM_GEOMETRY_3D 100188
#define QTY_UNIT_SECOND 1400        /* calendar offsets are added to dates in it */

/* The unit is valid for the quantity type (their dimensions agree). */
QTY_API int QTY_CALL qtyItemUnitEqv(int32_t itemType, int32_t unit);

QTY_API int QTY_CALL qtyGetItemTypeKey(int32_t itemType, const char** text);
QTY_API int QTY_CALL qtyGetUnitKey(int32_t unit, const char** text);
QTY_API int QTY_CALL qtyGetUnitTag(const char* unitText, int32_t* unit);
/* The sequenceNo-th (1-based) unit of a quantity type. */
QTY_API int QTY_CALL qtyGetItemUnitSeq(int32_t itemType, int32_t sequenceNo, int32_t* unit, const char** unitText);

QTY_API int QTY_CALL qtyConvertUnit(int32_t fromUnit, double value, int32_t toUnit, double* out);
/* From unit to the user unit of itemType, and back. */
QTY_API int QTY_CALL qtyConvertToUserUnit(int32_t itemType, int32_t unit, double value, double* out);
QTY_API int QTY_CALL qtyConvertFromUserUnit(int32_t itemType, int32_t unit, double value, double* out);

/* In-place array conversions; elements equal to deleteValue stay untouched. */
QTY_API int QTY_CALL qtyConvertItemArrayD(int32_t fromUnit, int32_t toUnit, double* array, int32_t count,
                                          double deleteValue);
QTY_API int QTY_CALL qtyConvertItemArrayF(int32_t fromUnit, int32_t toUnit, float* array, int32_t count,
                                          float deleteValue);
QTY_API int QTY_CALL qtyConvertItemArrayToUserUnitD(int32_t itemType, int32_t unit, double* array, int32_t count,
                                                    double deleteValue);
QTY_API int QTY_CALL qtyConvertItemArrayToUserUnitF(int32_t itemType, int32_t unit, float* array, int32_t count,
                                                    float deleteValue);
QTY_API int QTY_CALL qtyConvertItemArrayFromUserUnitD(int32_t itemType, int32_t unit, double* array,
                                                      int32_t count, double deleteValue);
QTY_API int QTY_CALL qtyConvertItemArrayFromUserUnitF(int32_t itemType, int32_t unit, float* array,
                                                      int32_t count, float deleteValue);

/* User unit of a quantity type (default: the first unit of its sequence). */
QTY_API int QTY_CALL qtySetUserUnit(int32_t itemType, int32_t unit);
QTY_API int QTY_CALL qtyGetUserUnit(int32_t itemType, int32_t* unit);

/* Enumeration, for tools and bindings. Indices are 0-based. */
QTY_API int32_t QTY_CALL qtyGetItemTypeCount(void);
QTY_API int QTY_CALL qtyGetItemTypeByIndex(int32_t index, int32_t* itemType, const char** text,
                                           const char** description);
QTY_API int32_t QTY_CALL qtyGetItemUnitCount(int32_t itemType);
QTY_API int32_t QTY_CALL qtyGetUnitCount(void);
QTY_API int QTY_CALL qtyGetUnitByIndex(int32_t index, int32_t* unit, const char** text, const char** description);
QTY_API int QTY_CALL qtyGetItemTypeDescription(int32_t itemType, const char** description);
QTY_API int QTY_CALL qtyGetUnitDescription(int32_t unit, const char** description);
/* Quantity type number of a text key (e.g. "WaterLevel"). */
QTY_API int QTY_CALL qtyGetItemTypeTag(const char* itemTypeText, int32_t* itemType);

#ifdef __cplusplus
}
#endif

#endif /* QTY_QTY_H */
