/** @file
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
/** Calling convention of the unit library's functions: __stdcall on 32-bit Windows, the platform default
 * elsewhere.
 */
#define QTY_CALL __stdcall
#else
/** Calling convention of the unit library's functions: __stdcall on 32-bit Windows, the platform default
 * elsewhere.
 */
#define QTY_CALL
#endif

#if defined(QTY_STATIC_DEFINE)
/** Marks the functions exported by the unit library. */
#define QTY_API
#elif defined(_WIN32)
#if defined(QTY_BUILDING)
/** Marks the functions exported by the unit library. */
#define QTY_API __declspec(dllexport)
#else
/** Marks the functions exported by the unit library. */
#define QTY_API __declspec(dllimport)
#endif
#else
/** Marks the functions exported by the unit library. */
#define QTY_API __attribute__((visibility("default")))
#endif

#ifdef __cplusplus
extern "C" {
#endif

/** Fixed keys. */
#define QTY_ITEM_UNDEFINED 999      /**< accepts unit 0 and any other unit */
/** Unit key 0: no unit (valid only with QTY_ITEM_UNDEFINED). */
#define QTY_UNIT_UNDEFINED 0
#define QTY_ITEM_GEOMETRY_0D 100185 /**< 0-D .. 3-D geometry: lengths */
/** Quantity type of the lengths of a 1-D axis. */
#define QTY_ITEM_GEOMETRY_1D 100186
/** Quantity type of the lengths of a 2-D axis. */
#define QTY_ITEM_GEOMETRY_2D 100187
/** Quantity type of the lengths of a 3-D axis. */
#define QTY_ITEM_GEOMETRY_3D 100188
#define QTY_UNIT_SECOND 1400        /**< calendar offsets are added to dates in it */

/** The unit is valid for the quantity type (their dimensions agree). */
QTY_API int QTY_CALL qtyItemUnitEqv(int32_t itemType, int32_t unit);

/** Text key of a quantity type, e.g. "WaterLevel" for 40101. @param itemType quantity type number. @param
 * text receives the static key text. @return non-zero when the quantity type is known.
 */
QTY_API int QTY_CALL qtyGetItemTypeKey(int32_t itemType, const char** text);
/** Text key of a unit, e.g. "m/s" for 20700. @param unit unit key number. @param text receives the static key
 * text. @return non-zero when the unit is known.
 */
QTY_API int QTY_CALL qtyGetUnitKey(int32_t unit, const char** text);
/** Unit key number of a unit text: the key itself ("m", "ft", "m/s") or one of its accepted spellings
 * ("second", "hours"). @param unitText zero-terminated text. @param unit receives the number. @return
 * non-zero when the text names a unit.
 */
QTY_API int QTY_CALL qtyGetUnitTag(const char* unitText, int32_t* unit);
/** The sequenceNo-th (1-based) unit of a quantity type. */
QTY_API int QTY_CALL qtyGetItemUnitSeq(int32_t itemType, int32_t sequenceNo, int32_t* unit, const char** unitText);

/** Converts one value between two units of the same dimension. @param fromUnit unit of value. @param value
 * the value. @param toUnit wanted unit. @param out receives the converted value. @return non-zero on success;
 * 0 for unknown units or units of different dimensions.
 */
QTY_API int QTY_CALL qtyConvertUnit(int32_t fromUnit, double value, int32_t toUnit, double* out);
/** From unit to the user unit of itemType, and back. */
QTY_API int QTY_CALL qtyConvertToUserUnit(int32_t itemType, int32_t unit, double value, double* out);
/** Converts one value from the user unit of itemType (qtySetUserUnit) into unit; the reverse of
 * qtyConvertToUserUnit. @return non-zero on success.
 */
QTY_API int QTY_CALL qtyConvertFromUserUnit(int32_t itemType, int32_t unit, double value, double* out);

/** In-place array conversions; elements equal to deleteValue stay untouched. */
QTY_API int QTY_CALL qtyConvertItemArrayD(int32_t fromUnit, int32_t toUnit, double* array, int32_t count,
                                          double deleteValue);
/** As qtyConvertItemArrayD for a float array and a float delete value. */
QTY_API int QTY_CALL qtyConvertItemArrayF(int32_t fromUnit, int32_t toUnit, float* array, int32_t count,
                                          float deleteValue);
/** Converts count doubles in place from unit into the user unit of itemType; elements equal to deleteValue
 * stay. @return non-zero on success.
 */
QTY_API int QTY_CALL qtyConvertItemArrayToUserUnitD(int32_t itemType, int32_t unit, double* array, int32_t count,
                                                    double deleteValue);
/** As qtyConvertItemArrayToUserUnitD for a float array and a float delete value. */
QTY_API int QTY_CALL qtyConvertItemArrayToUserUnitF(int32_t itemType, int32_t unit, float* array, int32_t count,
                                                    float deleteValue);
/** Converts count doubles in place from the user unit of itemType into unit; elements equal to deleteValue
 * stay. @return non-zero on success.
 */
QTY_API int QTY_CALL qtyConvertItemArrayFromUserUnitD(int32_t itemType, int32_t unit, double* array,
                                                      int32_t count, double deleteValue);
/** As qtyConvertItemArrayFromUserUnitD for a float array and a float delete value. */
QTY_API int QTY_CALL qtyConvertItemArrayFromUserUnitF(int32_t itemType, int32_t unit, float* array,
                                                      int32_t count, float deleteValue);

/** User unit of a quantity type (default: the first unit of its sequence). */
QTY_API int QTY_CALL qtySetUserUnit(int32_t itemType, int32_t unit);
/** The user unit of a quantity type (the first unit of its sequence unless qtySetUserUnit changed it).
 * @return non-zero when the quantity type is known.
 */
QTY_API int QTY_CALL qtyGetUserUnit(int32_t itemType, int32_t* unit);

/** Enumeration, for tools and bindings. Indices are 0-based. */
QTY_API int32_t QTY_CALL qtyGetItemTypeCount(void);
/** Quantity type number index (0 to qtyGetItemTypeCount() - 1) with its static key text and description; each
 * out pointer may be null. @return non-zero for a valid index.
 */
QTY_API int QTY_CALL qtyGetItemTypeByIndex(int32_t index, int32_t* itemType, const char** text,
                                           const char** description);
/** Number of units in the unit sequence of a quantity type; 0 for an unknown one. */
QTY_API int32_t QTY_CALL qtyGetItemUnitCount(int32_t itemType);
/** Number of units the library knows. */
QTY_API int32_t QTY_CALL qtyGetUnitCount(void);
/** Unit number index (0 to qtyGetUnitCount() - 1) with its static key text and description; each out pointer
 * may be null. @return non-zero for a valid index.
 */
QTY_API int QTY_CALL qtyGetUnitByIndex(int32_t index, int32_t* unit, const char** text, const char** description);
/** Static description of a quantity type ("Water level"). @return non-zero when known. */
QTY_API int QTY_CALL qtyGetItemTypeDescription(int32_t itemType, const char** description);
/** Static description of a unit ("metre per second"). @return non-zero when known. */
QTY_API int QTY_CALL qtyGetUnitDescription(int32_t unit, const char** description);
/** Quantity type number of a text key (e.g. "WaterLevel"). */
QTY_API int QTY_CALL qtyGetItemTypeTag(const char* itemTypeText, int32_t* itemType);

#ifdef __cplusplus
}
#endif

#endif /* QTY_QTY_H */
