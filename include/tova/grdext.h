/** @file
 * tova — the interface of extension plug-ins, for their authors.
 *
 * An extension plug-in is a shared library that offers derived items for the
 * gridded data files of one data type. grdEnablePlugin (grd.h) loads
 * "grdExt_<n>" with the platform's suffix (grdExt_7.so on Linux and other
 * POSIX systems, grdExt_7.dylib on macOS, grdExt_7.dll on Windows), n being
 * the absolute value of the file's data type. The library is found by the
 * platform loader's standard search only (LD_LIBRARY_PATH, the loader's cache
 * and default folders; the program's folder and PATH on Windows), never in
 * the data file's folder, and only when the caller asks for it.
 *
 * The library exports the entry points below under their exact names, as C
 * functions with the TOVA_CALL calling convention (__stdcall on 32-bit
 * Windows, where a module-definition file must export the names
 * undecorated). Declare them with GRD_EXT_EXPORT, or include this header so
 * that the prototypes give them that visibility. Every entry point takes the
 * header first; item numbers are 1-based.
 *
 * Required: grdExtGetNoOfItems, grdExtGetItemInfo, grdExtIsItemDerived,
 * grdExtNewTimeStep, grdExtReadItemTimeStep. The others are optional.
 *
 * How the library calls them:
 * - grdExtInitialize (optional) once when the plug-in is enabled; a non-zero
 *   result refuses the plug-in. grdExtTerminate is called exactly once for
 *   every successful grdExtInitialize: when the plug-in is unloaded
 *   (grdUnloadPlugin, or the header's destruction), and also when the
 *   plug-in is refused after its initialisation. Keep per-header state keyed
 *   by the header: one loaded library may serve several headers.
 * - Then grdExtGetNoOfItems gives the count M of items offered, and for each
 *   item k = 1 ... M, in this order: grdExtIsItemDerived, grdExtGetItemInfo,
 *   grdExtGetItemValueType, grdExtGetItemStatsGlobal, grdExtGetItemAxisType,
 *   grdExtGetItemAxisEq. Item k starts as a copy of the file's item k (for k
 *   at most the file's item count N) or of the file's item 1 without its
 *   name and unit text (beyond N); a derived item drops the copied name and
 *   unit text. The out arguments arrive holding the copy's values, so an
 *   entry point may leave any of them as they are.
 * - Reading: at the first item of every time step grdExtNewTimeStep, then
 *   for every item read grdExtReadItemTimeStep, which writes the values of
 *   the item that grdGetItemCursor names (grdGetItemElements values of the
 *   item's data type; data is null when the caller only skips). A skip
 *   (grdSkipItem, grdSkipTimeStep, positioning) calls grdExtNewTimeStep
 *   only. Statuses: 0 success, anything else is handed to the caller.
 *
 * While any entry point runs, the header shows the file as if no plug-in
 * were loaded: grdGetNoOfItems and grdItemD give the file's own items, and
 * grdReadItemTimeStep and grdSkipItem read and skip the file's records under
 * the cursor, advancing it. The usual way is to read all of the file's items
 * of the time step in grdExtNewTimeStep and keep them; the cursor is put
 * back afterwards. Values arrive as stored in the file (the caller's unit
 * conversions are applied by the library to what grdExtReadItemTimeStep
 * delivers, in the units that grdExtGetItemInfo declared).
 *
 * This header is C99 and C++ compatible.
 */
#ifndef TOVA_GRDEXT_H
#define TOVA_GRDEXT_H

#include "grd.h"

/* Visibility of a plug-in's entry points. */
#if defined(_WIN32)
/** Marks a plug-in's entry points as exported from the plug-in library. */
#define GRD_EXT_EXPORT __declspec(dllexport)
#elif defined(__GNUC__)
/** Marks a plug-in's entry points as exported from the plug-in library. */
#define GRD_EXT_EXPORT __attribute__((visibility("default")))
#else
/** Marks a plug-in's entry points as exported from the plug-in library. */
#define GRD_EXT_EXPORT
#endif

/** The exported names, as the library looks them up. */
#define GRD_EXT_INITIALIZE "grdExtInitialize"
/** Exported name of grdExtTerminate. */
#define GRD_EXT_TERMINATE "grdExtTerminate"
/** Exported name of grdExtGetNoOfItems. */
#define GRD_EXT_GET_NO_OF_ITEMS "grdExtGetNoOfItems"
/** Exported name of grdExtGetItemInfo. */
#define GRD_EXT_GET_ITEM_INFO "grdExtGetItemInfo"
/** Exported name of grdExtGetItemAxisType. */
#define GRD_EXT_GET_ITEM_AXIS_TYPE "grdExtGetItemAxisType"
/** Exported name of grdExtGetItemAxisEq. */
#define GRD_EXT_GET_ITEM_AXIS_EQ "grdExtGetItemAxisEq"
/** Exported name of grdExtIsItemDerived. */
#define GRD_EXT_IS_ITEM_DERIVED "grdExtIsItemDerived"
/** Exported name of grdExtGetItemStatsGlobal. */
#define GRD_EXT_GET_ITEM_STATS_GLOBAL "grdExtGetItemStatsGlobal"
/** Exported name of grdExtGetItemValueType. */
#define GRD_EXT_GET_ITEM_VALUE_TYPE "grdExtGetItemValueType"
/** Exported name of grdExtNewTimeStep. */
#define GRD_EXT_NEW_TIME_STEP "grdExtNewTimeStep"
/** Exported name of grdExtReadItemTimeStep. */
#define GRD_EXT_READ_ITEM_TIME_STEP "grdExtReadItemTimeStep"

TOVA_EXTERN_C_BEGIN

/** Prepares the plug-in for this header and file; non-zero refuses it. */
typedef int(TOVA_CALL* grdExtInitializeFn)(HeaderHandle header, FileHandle file);
/** Releases what the plug-in keeps for this header; the result is what
 * grdUnloadPlugin returns. */
typedef int(TOVA_CALL* grdExtTerminateFn)(HeaderHandle header);
/** Number of items offered (at least 1). */
typedef int(TOVA_CALL* grdExtGetNoOfItemsFn)(HeaderHandle header);
/** Describes item itemNo: quantity type, name, unit key, unit text, simple
 * type of the values (1-7) and a further name that the library does not use.
 * On 0 the library takes the values and copies both texts (a null text keeps
 * the item's). */
typedef int(TOVA_CALL* grdExtGetItemInfoFn)(HeaderHandle header, int32_t itemNo, int32_t* itemType,
                                            const char** name, int32_t* unit, const char** unitName,
                                            int32_t* dataType, const char** otherName);
/** 0-3: the item gets the equidistant axis of that dimension (EqD0 ... EqD3);
 * a negative value keeps the item's axis as copied; above 3 refuses the
 * plug-in. */
typedef int(TOVA_CALL* grdExtGetItemAxisTypeFn)(HeaderHandle header, int32_t itemNo);
/** Fills the equidistant axis given by grdExtGetItemAxisType (called only for
 * 0-3): axis unit, and per direction size, origin and step, in the axis unit.
 * On 0 the library takes them; a size below 1 refuses the plug-in. */
typedef int(TOVA_CALL* grdExtGetItemAxisEqFn)(HeaderHandle header, int32_t itemNo, int32_t* unit,
                                              int32_t sizes[3], float starts[3], float steps[3]);
/** Non-zero: the item's values are computed by the plug-in. */
typedef int(TOVA_CALL* grdExtIsItemDerivedFn)(HeaderHandle header, int32_t itemNo);
/** Preset item-global statistics (grdGetItemStatsGlobal); taken on 0. */
typedef int(TOVA_CALL* grdExtGetItemStatsGlobalFn)(HeaderHandle header, int32_t itemNo, double* minimum,
                                                   double* maximum, int32_t* deleteCount);
/** The item's value type (grdGetItemValueType); taken when 0-3. */
typedef int(TOVA_CALL* grdExtGetItemValueTypeFn)(HeaderHandle header, int32_t itemNo);
/** Called before the first item of every time step read or skipped. */
typedef int(TOVA_CALL* grdExtNewTimeStepFn)(HeaderHandle header, FileHandle file);
/** Writes the values of the item under the cursor (grdGetItemCursor) into
 * data; data is null when the caller skips the item. */
typedef int(TOVA_CALL* grdExtReadItemTimeStepFn)(HeaderHandle header, FileHandle file, void* data);

/* The entry points as a plug-in defines them. */
/** Entry point of a plug-in (optional): see grdExtInitializeFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtInitialize(HeaderHandle header, FileHandle file);
/** Entry point of a plug-in (optional): see grdExtTerminateFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtTerminate(HeaderHandle header);
/** Entry point of a plug-in (required): see grdExtGetNoOfItemsFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtGetNoOfItems(HeaderHandle header);
/** Entry point of a plug-in (required): see grdExtGetItemInfoFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemInfo(HeaderHandle header, int32_t itemNo, int32_t* itemType,
                                               const char** name, int32_t* unit, const char** unitName,
                                               int32_t* dataType, const char** otherName);
/** Entry point of a plug-in (optional): see grdExtGetItemAxisTypeFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemAxisType(HeaderHandle header, int32_t itemNo);
/** Entry point of a plug-in (optional): see grdExtGetItemAxisEqFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemAxisEq(HeaderHandle header, int32_t itemNo, int32_t* unit,
                                                 int32_t sizes[3], float starts[3], float steps[3]);
/** Entry point of a plug-in (required): see grdExtIsItemDerivedFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtIsItemDerived(HeaderHandle header, int32_t itemNo);
/** Entry point of a plug-in (optional): see grdExtGetItemStatsGlobalFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemStatsGlobal(HeaderHandle header, int32_t itemNo, double* minimum,
                                                      double* maximum, int32_t* deleteCount);
/** Entry point of a plug-in (optional): see grdExtGetItemValueTypeFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemValueType(HeaderHandle header, int32_t itemNo);
/** Entry point of a plug-in (required): see grdExtNewTimeStepFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtNewTimeStep(HeaderHandle header, FileHandle file);
/** Entry point of a plug-in (required): see grdExtReadItemTimeStepFn. */
GRD_EXT_EXPORT int TOVA_CALL grdExtReadItemTimeStep(HeaderHandle header, FileHandle file, void* data);

TOVA_EXTERN_C_END

#endif /* TOVA_GRDEXT_H */
