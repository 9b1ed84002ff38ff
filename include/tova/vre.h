/** @file
 * tova — VRE files: the response data of a set of panel bodies. A handle holds
 * eight size parameters, 23 vector items (arrays of doubles whose lengths follow
 * from the size parameters), two scalar items, the bodies' names and panel
 * counts and a symmetry pair. Every item carries a quantity key and a storage
 * unit of the unit library; values may be read and written in another unit
 * through a per-item conversion mode. A whole file is read into, or written
 * from, one handle by a single call.
 *
 * Size parameters: 0 N0, 1 body count B, 2 total panel count P (derived: the
 * sum of the first B panel counts), 3 N3, 4 N4, 5, 6 (1: items 21 and 22 are
 * present), 7 N7. Element counts of the vector items:
 *   0: 12*N0   1: 3*P   2: P   3: 3*P   4: P*N3   5, 6: 3*B   7: B
 *   8: N3*N3   9, 10: N4   11: 9*B   12, 13: P*N4*N3   14, 15: N4*N3*N3
 *   16-20: B   21: N7   22: N7*N4*N3
 * An item's buffer is made once, at the length the size parameters give when it
 * is first needed, and keeps that length: set the size parameters, body count
 * and panel counts first, then the items.
 */
#ifndef TOVA_VRE_H
#define TOVA_VRE_H

#include "status.h"

TOVA_EXTERN_C_BEGIN

#ifdef __cplusplus
class CVreHandle;
/** A VRE file in memory: size parameters, bodies, scalar and vector items. Made by vreHandleCreate or
 * vreFileRead, freed by vreHandleFree.
 */
typedef CVreHandle* VreHandle;
#else
/** A VRE file in memory: size parameters, bodies, scalar and vector items. Made by vreHandleCreate or
 * vreFileRead, freed by vreHandleFree.
 */
typedef struct CVreHandle* VreHandle;
#endif

/** Limits and special values. */
#define VRE_VECTOR_ITEMS 23        /**< vector items 0 .. 22 */
#define VRE_SCALAR_ITEMS 2         /**< scalar items 0, 1 */
#define VRE_SIZE_PARAMS 8          /**< size parameters 0 .. 7 */
#define VRE_NAME_LENGTH 256        /**< bytes per body name, zero included */
#define VRE_DELETE_VALUE (-1e-35)  /**< left untouched by array conversions */
#define VRE_NOT_SET 10000          /**< status: the item holds no values yet */

/* Unit conversion modes of an item. */
enum {
    VRE_CONVERT_NONE = 0,     /**< values in the storage unit */
    VRE_CONVERT_USER = 1,     /**< the unit library's user unit of the quantity */
    VRE_CONVERT_EXPLICIT = 2, /**< the item's own user unit */
    VRE_CONVERT_BASE = 3      /**< the first unit of the quantity's unit sequence */
};

/** A new handle: all size parameters 0, symmetry (1, 0), scalar 0 = 9.80665,
 * scalar 1 = 0.0, no item values. Null when it cannot be made. */
TOVA_API VreHandle TOVA_CALL vreHandleCreate(void);
/** Destroys the handle (null is allowed). Returns 0. */
TOVA_API int32_t TOVA_CALL vreHandleFree(VreHandle handle);

/** Reads a whole file into a new handle, stored in *out at once; the handle is
 * the caller's to free whatever the status. Returns the open status: 1000 for a
 * null argument, a record-file open failure (2003, 2014, 2017, ...), else 0.
 * Damaged contents are not reported: reading stops at the first bad record
 * and the handle keeps what was read until then. A file of a format version
 * other than 100 or 101 leaves the handle at its defaults. */
TOVA_API int32_t TOVA_CALL vreFileRead(const char* path, VreHandle* out);
/** Writes the handle to a new file (format version 101), making the buffers of
 * items never set at their current length, filled with zeros. Returns 0, 1000
 * for a null argument, 2000 when an element count is negative, does not fit or
 * cannot be allocated (nothing is created then), the create status, or the
 * first write or close failure. */
TOVA_API int32_t TOVA_CALL vreFileWrite(const char* path, VreHandle handle);

/** Size parameter index 0-7; -1 for another index or a null handle. */
TOVA_API int32_t TOVA_CALL vreGetVectorParam(VreHandle handle, int32_t index);
/** Sets size parameter index. 1000 for index 2 (derived from the panel counts)
 * and for a null handle; another index outside 0-7 is ignored with 0. */
TOVA_API int32_t TOVA_CALL vreSetVectorParam(VreHandle handle, int32_t index, int32_t value);
/** Element count of vector item index's buffer; 0 when it has none. */
TOVA_API int32_t TOVA_CALL vreGetVectorSize(VreHandle handle, int32_t index);

/** names: B * 256 bytes, one zero-terminated field per body. Get: 10000 when no
 * names were set or read; bodies beyond the stored names are zero-filled. */
TOVA_API int32_t TOVA_CALL vreGetBodyNames(VreHandle handle, char* names);
/** Sets the body names from B fields of VRE_NAME_LENGTH bytes each (B: size parameter 1). */
TOVA_API int32_t TOVA_CALL vreSetBodyNames(VreHandle handle, const char* names);
/** counts: B 32-bit integers. Set recomputes the total panel count P. */
TOVA_API int32_t TOVA_CALL vreGetBodyPanelCount(VreHandle handle, int32_t* counts);
/** Sets the panel count of each of the B bodies. */
TOVA_API int32_t TOVA_CALL vreSetBodyPanelCount(VreHandle handle, const int32_t* counts);

/** The two symmetry flags of the bodies. Returns 0, 1000 for a null handle. */
TOVA_API int32_t TOVA_CALL vreGetSymmetry(VreHandle handle, int32_t* first, int32_t* second);
/** Sets the two symmetry flags. Returns 0, 1000 for a null handle. */
TOVA_API int32_t TOVA_CALL vreSetSymmetry(VreHandle handle, int32_t first, int32_t second);

/** Scalar item 0 or 1, converted by its mode; VRE_DELETE_VALUE for another
 * index or a null handle. */
TOVA_API double TOVA_CALL vreGetScalarItem(VreHandle handle, int32_t index);
/** Converts value by the item's mode into its storage unit and stores it;
 * another index is ignored with 0. */
TOVA_API int32_t TOVA_CALL vreSetScalarItem(VreHandle handle, int32_t index, double value);

/** Quantity key, storage unit, conversion mode and user unit of an item; the
 * outputs are untouched for an unknown index. Returns 0 (1000 for a null
 * handle or output). */
TOVA_API int32_t TOVA_CALL vreGetScalarItemUnitInfo(VreHandle handle, int32_t index, int32_t* itemKey,
                                                    int32_t* unit, int32_t* mode, int32_t* userUnit);
/** As vreGetScalarItemUnitInfo for vector item index 0-22. */
TOVA_API int32_t TOVA_CALL vreGetVectorItemUnitInfo(VreHandle handle, int32_t index, int32_t* itemKey,
                                                    int32_t* unit, int32_t* mode, int32_t* userUnit);
/** Sets the storage unit (stored values are not converted). 2020 when the unit
 * does not belong to the item's quantity; 0 for an unknown index. */
TOVA_API int32_t TOVA_CALL vreSetScalarItemUnit(VreHandle handle, int32_t index, int32_t unit);
/** As vreSetScalarItemUnit for vector item index 0-22. */
TOVA_API int32_t TOVA_CALL vreSetVectorItemUnit(VreHandle handle, int32_t index, int32_t unit);
/** Stores the conversion mode; stores unit as the user unit when it belongs to
 * the item's quantity, else returns 2020. 0 for an unknown index. */
TOVA_API int32_t TOVA_CALL vreSetScalarItemUnitConversion(VreHandle handle, int32_t index, int32_t mode,
                                                          int32_t unit);
/** As vreSetScalarItemUnitConversion for vector item index 0-22. */
TOVA_API int32_t TOVA_CALL vreSetVectorItemUnitConversion(VreHandle handle, int32_t index, int32_t mode,
                                                          int32_t unit);

/** Copies vreGetVectorSize(index) values out, converted by the item's mode
 * (elements equal to VRE_DELETE_VALUE stay as they are). 10000 when the item
 * has no buffer or the index is outside 0-22. */
TOVA_API int32_t TOVA_CALL vreGetVectorItem(VreHandle handle, int32_t index, double* values);
/** Makes the item's buffer if needed at the current element count, copies that
 * many values in (vreGetVectorSize(index) once the buffer exists) and converts
 * them by the mode into the storage unit. 2000 when the buffer cannot be made
 * or the index is outside 0-22. */
TOVA_API int32_t TOVA_CALL vreSetVectorItem(VreHandle handle, int32_t index, const double* values);

TOVA_EXTERN_C_END

#endif /* TOVA_VRE_H */
