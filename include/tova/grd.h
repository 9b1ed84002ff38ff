/** @file
 * tova — the gridded data-file API: the header model (file attributes,
 * items, item axes, time axes), the file lifecycle, static and dynamic data,
 * positioning, statistics and extension plug-ins, plus the error-handler table
 * and the API trace switch.
 */
#ifndef TOVA_GRD_H
#define TOVA_GRD_H

#include "rcf.h"
#include "status.h"

TOVA_EXTERN_C_BEGIN

/* ---- Handles and enums ---------------------------------------------------- */

/** One item of a header (numbered from 1), or the item of a static item. Lent
 * by the header (or owned by the static item); never freed by callers. */
typedef struct GrdItem* ItemHandle;
/** One custom block of a header's chain; lent by the header. */
typedef struct GrdCustomBlock* CustomBlockHandle;

/** The file's time/space organisation; only these exact values are valid. */
typedef enum {
    F_UNDEFINED_FILE_TYPE = 0,
    F_EQTIME_FIXEDSPACE_ALLITEMS = 1,
    F_EQTIME_TVARSPACE_ALLITEMS = 2,
    F_NEQTIME_FIXEDSPACE_ALLITEMS = 4,
    F_NEQTIME_FIXEDSPACE_VARITEMS = 8,
    F_NEQTIME_TVARSPACE_VARITEMS = 16
} FileType;

/** Kind of the header's time axis (grdGetTimeAxisType). Kinds 1 and 3 belong to the equidistant file types 1
 * and 2, kinds 2 and 4 to file types 4, 8 and 16.
 */
typedef enum {
    F_UNDEFINED_TAXIS = 0,
    F_TM_EQ_AXIS = 1,   /**< equidistant time values */
    F_TM_NEQ_AXIS = 2,  /**< non-equidistant time values */
    F_CAL_EQ_AXIS = 3,  /**< equidistant calendar axis */
    F_CAL_NEQ_AXIS = 4  /**< non-equidistant calendar axis */
} TimeAxisType;

/** Kind of an item's spatial axis (grdGetItemAxisType): equidistant (Eq), non-equidistant (Neq), time-varying
 * (Tvar) or curvilinear, with its dimension.
 */
typedef enum {
    F_UNDEFINED_AXIS = 0,
    F_EQ_AXIS_D0 = 1,  /**< a single value */
    F_EQ_AXIS_D1 = 2,
    F_NEQ_AXIS_D1 = 3,
    F_TVAR_AXIS_D1 = 4,
    F_EQ_AXIS_D2 = 5,
    F_NEQ_AXIS_D2 = 6,
    F_TVAR_AXIS_D2 = 7,
    F_EQ_AXIS_D3 = 8,
    F_NEQ_AXIS_D3 = 9,
    F_TVAR_AXIS_D3 = 10,
    F_EQ_AXIS_D4 = 11,
    F_CURVE_LINEAR_AXIS_D2 = 12, /**< dimension reported as -1 */
    F_CURVE_LINEAR_AXIS_D3 = 13  /**< dimension reported as -1 */
} ItemAxisType;

/** Chosen at creation: 1 item-global statistics only; 2 and 3 add a
 * per-element statistics record to every item. */
typedef enum {
    F_ITEM_STATS_GLOBAL = 1,
    F_ITEM_STATS_ELEMENT = 2,
    F_ITEM_STATS_ELEMENT_ALT = 3
} ItemStatsType;

/** Kind of the header's map projection (grdGetGeoInfoType). */
typedef enum {
    F_UNDEFINED_GEOINFO = 0,
    F_UTM_PROJECTION = 1 /**< projection string plus origin and orientation */
} GeoInfoType;

/** Default delete (missing-value) markers of a new header. */
#define F_DELETE_VALUE_FLOAT (-1e-35f)   /**< bits 0x8554AD2E */
#define F_DELETE_VALUE_DOUBLE (-1e-255)  /**< bits 0x8AFE07B27DD78B14 */
/** Default delete value of byte items. */
#define F_DELETE_VALUE_BYTE 0
/** Default delete value of 32-bit integer items. */
#define F_DELETE_VALUE_INT 2147483647
/** Default delete value of unsigned 32-bit integer items. */
#define F_DELETE_VALUE_UNSIGNED_INT 2147483647u

/** Version of the data-file layer, also the format version of new files. */
#define F_GRD_VERSION 206

/* ---- Error handlers and tracing ------------------------------------------ */

/** Stores handler in the slot of code (1000, 2000-2019) and returns the handler
 * value. For 2020 and any other code nothing is stored and the result is
 * code - 2001 above 2000, else code. The result is pointer-sized so that the
 * handler value survives on 64-bit platforms. */
TOVA_API intptr_t TOVA_CALL grdAddErrorHandler(int32_t code, grdErrorHandler handler);
/** Clears every handler slot; the argument is not stored. Returns non-zero. */
TOVA_API intptr_t TOVA_CALL grdAddCommonErrorHandler(grdErrorHandler handler);
/** Clears every handler slot. */
TOVA_API void TOVA_CALL grdInitSystem(void);
/** Sets the API trace flag to flag as given; returns flag. */
TOVA_API int32_t TOVA_CALL grdDebugOn(int32_t flag);


/* ---- Conventions of the header model -------------------------------------
 * Every function returns a status (0, or a code of status.h) unless said
 * otherwise; a failure is passed to the registered error handler first.
 * Getters that return a value give a fixed fallback for a null handle. Texts
 * and arrays handed to setters are copied; those handed out by getters are
 * lent: they stay owned by the header and valid until the next setter of the
 * same attribute or the header's destruction. Every out pointer may be null
 * and is then skipped, unless said otherwise. */

/* ---- Header object -------------------------------------------------------- */

/** Makes a header: 2010 when statsType is not 1-3 or noOfItems is below 1.
 * *header is written in every case (null on failure). */
TOVA_API int32_t TOVA_CALL grdHeaderCreate(int32_t fileType, const char* fileTitle, const char* appTitle,
                                           int32_t appVersionNo, int32_t noOfItems, int32_t statsType,
                                           HeaderHandle* header);
/** Frees the header and everything it owns; sets *header to null. */
TOVA_API int32_t TOVA_CALL grdHeaderDestroy(HeaderHandle* header);

/** Name of a file type ("F_EQTIME_FIXEDSPACE_ALLITEMS", ...); static text, "*** FileType error ***" for other
 * values.
 */
TOVA_API const char* TOVA_CALL grdFileTypeStr(int32_t fileType);
/** Name of a time-axis kind ("F_TM_EQ_AXIS", ...); static text. */
TOVA_API const char* TOVA_CALL grdTimeAxisTypeStr(int32_t timeAxisType);
/** Name of a simple type ("float", "double", "byte", "integer*4", ...); static text. */
TOVA_API const char* TOVA_CALL grdSimpleTypeStr(int32_t simpleType);
/** 206. */
TOVA_API int32_t TOVA_CALL grdGetVersionCurrent(void);

/* ---- File-level attributes ------------------------------------------------ */

/** The header's file type (FileType). */
TOVA_API int32_t TOVA_CALL grdGetFileType(HeaderHandle header);                 /**< null: 0 */
/** The file title, lent by the header. */
TOVA_API const char* TOVA_CALL grdGetFileTitle(HeaderHandle header);            /**< never null */
/** Sets the file title (copied). 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetFileTitle(HeaderHandle header, const char* title);
/** The title of the writing application, lent by the header. */
TOVA_API const char* TOVA_CALL grdGetAppTitle(HeaderHandle header);             /**< never null */
/** Sets the title of the writing application (copied). 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetAppTitle(HeaderHandle header, const char* title);
/** The version number of the writing application. */
TOVA_API int32_t TOVA_CALL grdGetAppVersionNo(HeaderHandle header);             /**< null: -1 */
/** Sets the version number of the writing application. 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetAppVersionNo(HeaderHandle header, int32_t versionNo);
/** Caller-defined content class; its absolute value names the extension. */
/** The caller-defined data type (content class). */
TOVA_API int32_t TOVA_CALL grdGetDataType(HeaderHandle header);                 /**< null: 0 */
/** Sets the caller-defined data type (content class); its absolute value selects the extension plug-in
 * "grdExt_<n>" (grdEnablePlugin). 1000 for a null header.
 */
TOVA_API int32_t TOVA_CALL grdSetDataType(HeaderHandle header, int32_t dataType);
/** The statistics type chosen at creation (ItemStatsType). */
TOVA_API int32_t TOVA_CALL grdGetItemStatsType(HeaderHandle header);            /**< null: 0 */

/** Delete values per element type (null header: 0). Setters do not validate. */
TOVA_API float TOVA_CALL grdGetDeleteValFloat(HeaderHandle header);
/** Delete value of double items (-1e-255 unless set). */
TOVA_API double TOVA_CALL grdGetDeleteValDouble(HeaderHandle header);
/** Delete value of byte items (0 unless set). */
TOVA_API char TOVA_CALL grdGetDeleteValByte(HeaderHandle header);
/** Delete value of 32-bit integer items (2147483647 unless set). */
TOVA_API int32_t TOVA_CALL grdGetDeleteValInt(HeaderHandle header);
/** Delete value of unsigned 32-bit integer items (2147483647 unless set). */
TOVA_API uint32_t TOVA_CALL grdGetDeleteValUnsignedInt(HeaderHandle header);
/** Sets the delete value of float items; set it before writing values. 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetDeleteValFloat(HeaderHandle header, float value);
/** Sets the delete value of double items. 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetDeleteValDouble(HeaderHandle header, double value);
/** Sets the delete value of byte items. 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetDeleteValByte(HeaderHandle header, char value);
/** Sets the delete value of 32-bit integer items. 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetDeleteValInt(HeaderHandle header, int32_t value);
/** Sets the delete value of unsigned 32-bit integer items. 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetDeleteValUnsignedInt(HeaderHandle header, uint32_t value);

/** Whether the calendar getters apply the start offset to the date (1 at
 * creation). */
TOVA_API int32_t TOVA_CALL grdParamModifyTimes(HeaderHandle header, int32_t flag);

/** Map projection. */
/** The kind of map projection (GeoInfoType); 0 when none is set. */
TOVA_API int32_t TOVA_CALL grdGetGeoInfoType(HeaderHandle header);              /**< null: 0 */
/** Sets the map projection: its text (copied), the longitude and latitude of the origin and the orientation
 * (degrees). 1000 for a null header.
 */
TOVA_API int32_t TOVA_CALL grdSetGeoInfoUTMProj(HeaderHandle header, const char* projection, double longitude,
                                                double latitude, double orientation);
/** Changes the projection of a header already written, without changing its
 * size: only when a projection is set and the new text is not longer than the
 * stored one (the stored length is kept, padded with blanks). Otherwise 2010,
 * returned without calling the error handler. */
TOVA_API int32_t TOVA_CALL grdUpdateGeoInfoUTMProj(HeaderHandle header, const char* projection,
                                                   double longitude, double latitude, double orientation);
/** 1000 when no projection is set, 2010 for an unknown geo info type. */
TOVA_API int32_t TOVA_CALL grdGetGeoInfoUTMProj(HeaderHandle header, const char** projection, double* longitude,
                                                double* latitude, double* orientation);
/** Removes the map projection. 1000 for a null header. */
TOVA_API int32_t TOVA_CALL grdSetGeoInfoUndefined(HeaderHandle header);

/** Custom blocks: named arrays of a simple type (1-7) kept in insertion order.
 * Other types keep their name and count but no data. */
TOVA_API int32_t TOVA_CALL grdAddCustomBlock(HeaderHandle header, int32_t simpleType, const char* name,
                                             int32_t count, const void* data);
/** The first block, null when there is none. */
TOVA_API int32_t TOVA_CALL grdGetCustomBlockRef(HeaderHandle header, CustomBlockHandle* block);
/** *data is written only for types 1-7. */
TOVA_API int32_t TOVA_CALL grdGetCustomBlock(CustomBlockHandle block, int32_t* simpleType, const char** name,
                                             int32_t* count, const void** data, CustomBlockHandle* next);

/* ---- Items ---------------------------------------------------------------- */

/** Number of dynamic items; item numbers run from 1 to it. */
TOVA_API int32_t TOVA_CALL grdGetNoOfItems(HeaderHandle header);                /**< null: 0 */
/** Item itemNo (1-based); null when the header is null or the number is out
 * of range (2007). */
TOVA_API ItemHandle TOVA_CALL grdItemD(HeaderHandle header, int32_t itemNo);
/** The item of a static item (the static item itself); null when null. */
TOVA_API ItemHandle TOVA_CALL grdItemS(ItemHandle staticItem);

/** Resets the item and gives it a name, quantity type, unit and data type
 * (simple type 1-7) and an EqD0 axis; 2020 when the unit does not suit the
 * quantity type. */
TOVA_API int32_t TOVA_CALL grdSetItemInfo(HeaderHandle header, ItemHandle item, int32_t itemType, const char* name,
                                          int32_t unit, int32_t dataType);
/** As grdSetItemInfo with the unit as a text (unit key 0, no unit test). */
TOVA_API int32_t TOVA_CALL grdSetItemInfo_(HeaderHandle header, ItemHandle item, int32_t itemType,
                                           const char* name, const char* unitText, int32_t dataType);
/** For an item already written: the name keeps its stored length (blank
 * padded or cut); quantity type and unit are replaced. */
TOVA_API int32_t TOVA_CALL grdUpdateItemInfo(HeaderHandle header, ItemHandle item, int32_t itemType,
                                             const char* name, int32_t unit);
/** Name, quantity type and unit of an item, with their text keys from the unit library (qtyGetItemTypeKey,
 * qtyGetUnitKey), and its simple type. Texts are lent by the header. 1000 for a null item.
 */
TOVA_API int32_t TOVA_CALL grdGetItemInfo(ItemHandle item, int32_t* itemType, const char** itemTypeText,
                                          const char** name, int32_t* unit, const char** unitText,
                                          int32_t* dataType);
/** The stored fields as they are (the unit text may be null). */
TOVA_API int32_t TOVA_CALL grdGetItemInfo_(ItemHandle item, int32_t* itemType, const char** name,
                                           const char** unitText, int32_t* dataType);

/** Stores the item's value type, a caller-defined classification of its values (0 by default), returned
 * unchanged by grdGetItemValueType. The settings below are stored and returned unchanged as well. */
TOVA_API int32_t TOVA_CALL grdSetItemValueType(ItemHandle item, int32_t valueType);
/** The value type stored with grdSetItemValueType; valueType must not be null (1000). */
TOVA_API int32_t TOVA_CALL grdGetItemValueType(ItemHandle item, int32_t* valueType); /**< out required */
/** Sets how values of the item are converted between the caller and the file: mode 0 none; 1 from and to the
 * unit library's user unit of the item's quantity; 2 from and to unit (an alternative unit of the quantity);
 * 3 from and to the first unit of the quantity's sequence. Writes convert a private copy, reads convert the
 * caller's buffer. 1000 for a null item.
 */
TOVA_API int32_t TOVA_CALL grdSetItemUnitConversion(ItemHandle item, int32_t mode, int32_t unit);
/** The item's unit conversion mode and alternative unit (grdSetItemUnitConversion). 1000 for a null item. */
TOVA_API int32_t TOVA_CALL grdGetItemUnitConversion(ItemHandle item, int32_t* mode, int32_t* unit);
/** As grdSetItemUnitConversion for the coordinates of the item's axis (origins, steps, coordinate arrays).
 * 1000 for a null item.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisUnitConversion(ItemHandle item, int32_t mode, int32_t unit);
/** The axis unit conversion mode and unit (grdSetItemAxisUnitConversion). 1000 for a null item. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisUnitConversion(ItemHandle item, int32_t* mode, int32_t* unit);
/** Sets the orientation angles of the item's axis (degrees), stored and returned unchanged. 1000 for a null
 * item.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisOrientation(ItemHandle item, float alpha, float phi, float theta);
/** The orientation angles of the item's axis; for a null item -1e-35 in every output. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisOrientation(ItemHandle item, float* alpha, float* phi, float* theta);
/** Reference coordinates, converted by the axis unit conversion mode. */
TOVA_API int32_t TOVA_CALL grdSetItemRefCoords(ItemHandle item, float x, float y, float z);
/** The item's reference coordinates, converted for the caller; for a null item -1e-35 in every output. */
TOVA_API int32_t TOVA_CALL grdGetItemRefCoords(ItemHandle item, float* x, float* y, float* z);

/** Quantity type of the axis: 100185-100188 for 0-D to 3-D axes, else 999. */
TOVA_API int32_t TOVA_CALL grdGetItemGeometryType(ItemHandle item);
/** Unit of the item's axis coordinates; 0 for an undefined axis or a null item. */
TOVA_API int32_t TOVA_CALL grdGetItemGeometryUnit(ItemHandle item);
/** Dimension of the axis: 0-4; -1 for undefined and curvilinear axes. */
TOVA_API int32_t TOVA_CALL grdGetItemDim(ItemHandle item);

/** Sizes (0 with 2010 reported where the axis kind has no such size, or the
 * product exceeds 2147483647). */
TOVA_API int32_t TOVA_CALL grdGetItemXSize(ItemHandle item);
/** Elements of the first two directions (x times y). */
TOVA_API int32_t TOVA_CALL grdGetItemXYSize(ItemHandle item);
/** Elements of the first three directions (x times y times z). */
TOVA_API int32_t TOVA_CALL grdGetItemXYZSize(ItemHandle item);
/** Element counts: full, or capped at the key length for a compressed item
 * (Used: whenever the file is compressed; plain: once compression is
 * enabled too). Bytes: those counts times the element size. */
TOVA_API int32_t TOVA_CALL grdGetItemElements(ItemHandle item);
/** Elements stored per time step: the element count, or the encoding-key length for an item of a compressed
 * file.
 */
TOVA_API int32_t TOVA_CALL grdGetUsedItemElements(ItemHandle item);
/** Bytes of one time step of the item at full size (grdGetItemElements times the element size): the size of a
 * read buffer.
 */
TOVA_API int32_t TOVA_CALL grdGetItemBytes(ItemHandle item);
/** Bytes of the elements stored per time step (grdGetUsedItemElements times the element size). */
TOVA_API int32_t TOVA_CALL grdGetUsedItemBytes(ItemHandle item);

/** Static associations: links from item itemNo to static item numbers. */
TOVA_API int32_t TOVA_CALL grdSetAssocStatic(HeaderHandle header, int32_t itemNo, int32_t staticNo);
/** Number of static items associated with item itemNo. */
TOVA_API int32_t TOVA_CALL grdGetNoAssocStatic(HeaderHandle header, int32_t itemNo); /**< error: 0 */
/** index is 1-based; *staticNo is 0 when the chain is shorter. */
TOVA_API int32_t TOVA_CALL grdGetAssocStatic(HeaderHandle header, int32_t itemNo, int32_t index,
                                             int32_t* staticNo);

/** Encoding keys of a compressed file: entry i of the x, y and z keys is the
 * grid position of the i-th stored element. Setting them marks the file
 * compressed; a key not given is absent. */
TOVA_API int32_t TOVA_CALL grdSetEncodeKey(HeaderHandle header, const int32_t* xKey, const int32_t* yKey,
                                           const int32_t* zKey, int32_t length);
/** Copies each stored key into the caller's buffer of the same position. */
TOVA_API int32_t TOVA_CALL grdGetEncodeKey(HeaderHandle header, int32_t* xKey, int32_t* yKey, int32_t* zKey);
/** Length of the encoding keys of a compressed file: the elements stored per item and time step. */
TOVA_API int32_t TOVA_CALL grdGetEncodeKeySize(HeaderHandle header);   /**< null: 0 */
/** Non-zero when the header holds encoding keys (a compressed file). */
TOVA_API int32_t TOVA_CALL grdIsFileCompressed(HeaderHandle header);   /**< null: 0 */
/** Lets grdGetItemElements count only the key's elements; returns header. */
TOVA_API HeaderHandle TOVA_CALL grdItemEnableCompression(HeaderHandle header);
/** *length := the key length when the item's header holds an x and a y key,
 * else 0. Returns the status of the item check. */
TOVA_API int32_t TOVA_CALL grdIsItemCompressed(ItemHandle item, int32_t* length);

/* ---- Item spatial axes ----------------------------------------------------
 * Setters copy the caller's arrays and convert the values into the stored
 * axis unit by the item's axis unit conversion mode. Getters give the unit,
 * its text, the sizes and the values converted for the caller; coordinate
 * arrays are the item's own, converted in place (a second call with a
 * conversion mode of 1-3 converts them again). A non-equidistant direction of
 * size n holds n + 1 boundary coordinates; a curvilinear array one value per
 * node ((X+1)(Y+1) or (X+1)(Y+1)(Z+1)). The last int32 of the coordinate
 * setters is not used. */

/** Kind of the item's spatial axis (ItemAxisType). */
TOVA_API int32_t TOVA_CALL grdGetItemAxisType(ItemHandle item);        /**< null: 0 */

/** Gives the item a single value (no spatial extent); unit: unit of the axis coordinates. 1000 for a null
 * item; 2010 when the file type does not allow the axis kind. */
TOVA_API int32_t TOVA_CALL grdSetItemAxisEqD0(ItemHandle item, int32_t unit);
/** Unit of a 0-D axis. 1000 for a null item or another axis kind. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisEqD0(ItemHandle item, int32_t* unit, const char** unitText);
/** Equidistant 1-D axis of xSize cells from origin x0, dx apart, in unit (a length unit key). 1000 for a
 * null item, a size below 1, a step not above 0 or (for the array setters) a missing array; 2010 when the
 * file type does not allow the axis kind (equidistant, non-equidistant and curvilinear axes need file type
 * 1, 4 or 8, time-varying axes 2 or 16); 2000 when memory fails. A failed call leaves the previous axis. */
TOVA_API int32_t TOVA_CALL grdSetItemAxisEqD1(ItemHandle item, int32_t unit, int32_t xSize, float x0, float dx);
/** Unit, unit text, size, origin and step of an equidistant 1-D axis. 1000 for a null item or another axis
 * kind.
 */
TOVA_API int32_t TOVA_CALL grdGetItemAxisEqD1(ItemHandle item, int32_t* unit, const char** unitText,
                                              int32_t* xSize, float* x0, float* dx);
/** Equidistant 2-D grid of xSize by ySize cells from origin (x0, y0), dx and dy apart, in unit. Values of a
 * time step are stored x fastest: element i + j * xSize. Statuses as grdSetItemAxisEqD1.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisEqD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize, float x0,
                                              float y0, float dx, float dy);
/** Unit, unit text, sizes, origin and steps of an equidistant 2-D axis. 1000 for a null item or another axis
 * kind.
 */
TOVA_API int32_t TOVA_CALL grdGetItemAxisEqD2(ItemHandle item, int32_t* unit, const char** unitText,
                                              int32_t* xSize, int32_t* ySize, float* x0, float* y0, float* dx,
                                              float* dy);
/** Equidistant 3-D grid, x fastest then y then z. Statuses as grdSetItemAxisEqD1. */
TOVA_API int32_t TOVA_CALL grdSetItemAxisEqD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                              int32_t zSize, float x0, float y0, float z0, float dx, float dy,
                                              float dz);
/** Unit, unit text, sizes, origin and steps of an equidistant 3-D axis. 1000 for a null item or another axis
 * kind.
 */
TOVA_API int32_t TOVA_CALL grdGetItemAxisEqD3(ItemHandle item, int32_t* unit, const char** unitText,
                                              int32_t* xSize, int32_t* ySize, int32_t* zSize, float* x0, float* y0,
                                              float* z0, float* dx, float* dy, float* dz);
/** Equidistant 4-D grid (x, y, z, t), x fastest. Statuses as grdSetItemAxisEqD1. */
TOVA_API int32_t TOVA_CALL grdSetItemAxisEqD4(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                              int32_t zSize, int32_t tSize, float x0, float y0, float z0, float t0,
                                              float dx, float dy, float dz, float dt);
/** Unit, unit text, sizes, origin and steps of an equidistant 4-D axis. 1000 for a null item or another axis
 * kind.
 */
TOVA_API int32_t TOVA_CALL grdGetItemAxisEqD4(ItemHandle item, int32_t* unit, const char** unitText,
                                              int32_t* xSize, int32_t* ySize, int32_t* zSize, int32_t* tSize,
                                              float* x0, float* y0, float* z0, float* t0, float* dx, float* dy,
                                              float* dz, float* dt);

/** Non-equidistant 1-D axis: xSize cells bounded by xSize + 1 coordinates (copied). Statuses as
 * grdSetItemAxisEqD1.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisNeqD1(ItemHandle item, int32_t unit, int32_t xSize, const double* xCoords,
                                               int32_t unused);
/** Unit, unit text, size and boundary coordinates (lent by the header) of a non-equidistant 1-D axis. 1000
 * for a null item or another axis kind.
 */
TOVA_API int32_t TOVA_CALL grdGetItemAxisNeqD1(ItemHandle item, int32_t* unit, const char** unitText,
                                               int32_t* xSize, const double** xCoords);
/** Non-equidistant 2-D axis: xSize + 1 and ySize + 1 boundary coordinates (copied). Statuses as
 * grdSetItemAxisEqD1.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisNeqD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                               const double* xCoords, const double* yCoords, int32_t unused);
/** Unit, sizes and boundary coordinates (lent) of a non-equidistant 2-D axis. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisNeqD2(ItemHandle item, int32_t* unit, const char** unitText,
                                               int32_t* xSize, int32_t* ySize, const double** xCoords,
                                               const double** yCoords);
/** Non-equidistant 3-D axis: n + 1 boundary coordinates per direction (copied). Statuses as
 * grdSetItemAxisEqD1.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisNeqD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                               int32_t zSize, const double* xCoords, const double* yCoords,
                                               const double* zCoords, int32_t unused);
/** Unit, sizes and boundary coordinates (lent) of a non-equidistant 3-D axis. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisNeqD3(ItemHandle item, int32_t* unit, const char** unitText,
                                               int32_t* xSize, int32_t* ySize, int32_t* zSize,
                                               const double** xCoords, const double** yCoords,
                                               const double** zCoords);

/** Curvilinear 2-D grid of xSize by ySize cells: the x and y coordinates of its (xSize + 1)(ySize + 1) nodes,
 * x fastest (copied). Statuses as grdSetItemAxisEqD1.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisCurveLinearD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                                       const double* xNodes, const double* yNodes, int32_t unused);
/** Unit, sizes and node coordinates (lent) of a curvilinear 2-D grid. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisCurveLinearD2(ItemHandle item, int32_t* unit, const char** unitText,
                                                       int32_t* xSize, int32_t* ySize, const double** xNodes,
                                                       const double** yNodes);
/** Curvilinear 3-D grid: x, y and z coordinates of its (xSize + 1)(ySize + 1)(zSize + 1) nodes (copied).
 * Statuses as grdSetItemAxisEqD1.
 */
TOVA_API int32_t TOVA_CALL grdSetItemAxisCurveLinearD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                                       int32_t zSize, const double* xNodes, const double* yNodes,
                                                       const double* zNodes, int32_t unused);
/** Unit, sizes and node coordinates (lent) of a curvilinear 3-D grid. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisCurveLinearD3(ItemHandle item, int32_t* unit, const char** unitText,
                                                       int32_t* xSize, int32_t* ySize, int32_t* zSize,
                                                       const double** xNodes, const double** yNodes,
                                                       const double** zNodes);

/** Time-varying axes: only the sizes; coordinates travel with the data. */
TOVA_API int32_t TOVA_CALL grdSetItemAxisTvarD1(ItemHandle item, int32_t unit, int32_t xSize);
/** Unit and size of a time-varying 1-D axis. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisTvarD1(ItemHandle item, int32_t* unit, const char** unitText,
                                                int32_t* xSize);
/** Time-varying 2-D axis of xSize by ySize elements. */
TOVA_API int32_t TOVA_CALL grdSetItemAxisTvarD2(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize);
/** Unit and sizes of a time-varying 2-D axis. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisTvarD2(ItemHandle item, int32_t* unit, const char** unitText,
                                                int32_t* xSize, int32_t* ySize);
/** Time-varying 3-D axis. */
TOVA_API int32_t TOVA_CALL grdSetItemAxisTvarD3(ItemHandle item, int32_t unit, int32_t xSize, int32_t ySize,
                                                int32_t zSize);
/** Unit and sizes of a time-varying 3-D axis. */
TOVA_API int32_t TOVA_CALL grdGetItemAxisTvarD3(ItemHandle item, int32_t* unit, const char** unitText,
                                                int32_t* xSize, int32_t* ySize, int32_t* zSize);

/* ---- Time axes ------------------------------------------------------------
 * Equidistant kinds belong to file types 1 and 2, non-equidistant kinds to
 * 4, 8 and 16: the other family gives 1000, an unknown file type 2010.
 * Calendar dates are "yyyy-mm-dd", times "hh:mm:ss" (digits are not
 * range-checked): 2011 / 2012 otherwise. */

/** Equidistant time axis (kind 1) of file types 1 and 2: time step n lies at startTime + n * timeStep in unit
 * (a time unit key, e.g. QTY_UNIT_SECOND). firstIndex: index of the first stored time step. 1000 for a null
 * header, another file type family or a step not above 0; 2010 for an unknown file type.
 */
TOVA_API int32_t TOVA_CALL grdSetEqTimeAxis(HeaderHandle header, int32_t unit, double startTime, double timeStep,
                                            int32_t firstIndex);
/** The start time is accepted and not stored. */
TOVA_API int32_t TOVA_CALL grdSetNeqTimeAxis(HeaderHandle header, int32_t unit, double startTime,
                                             int32_t firstIndex);
/** Equidistant calendar axis (kind 3) of file types 1 and 2: time step n lies startOffset + n * timeStep (in
 * unit) after startDate ("yyyy-mm-dd") startTime ("hh:mm:ss"). 2011 for a bad date text, 2012 for a bad time
 * text; otherwise as grdSetEqTimeAxis.
 */
TOVA_API int32_t TOVA_CALL grdSetEqCalendarAxis(HeaderHandle header, const char* startDate, const char* startTime,
                                                int32_t unit, double startOffset, double timeStep,
                                                int32_t firstIndex);
/** The start offset is accepted and not stored. */
TOVA_API int32_t TOVA_CALL grdSetNeqCalendarAxis(HeaderHandle header, const char* startDate,
                                                 const char* startTime, int32_t unit, double startOffset,
                                                 int32_t firstIndex);

/** Kind of the header's time axis (TimeAxisType); says which time-axis getter applies. */
TOVA_API int32_t TOVA_CALL grdGetTimeAxisType(HeaderHandle header);   /**< null: 0 */
/** Unit, unit text, start, step, number of time steps and first index of an equidistant time axis; the unit
 * text is lent. 1000 for a null header or another axis kind.
 */
TOVA_API int32_t TOVA_CALL grdGetEqTimeAxis(HeaderHandle header, int32_t* unit, const char** unitText,
                                            double* startTime, double* timeStep, int32_t* noOfTimeSteps,
                                            int32_t* firstIndex);
/** Unit, unit text, start (the time of the first step written), the stored step, number of time steps and
 * first index of a non-equidistant time axis. 1000 for a null header or another axis kind.
 */
TOVA_API int32_t TOVA_CALL grdGetNeqTimeAxis(HeaderHandle header, int32_t* unit, const char** unitText,
                                             double* startTime, double* timeStep, int32_t* noOfTimeSteps,
                                             int32_t* firstIndex);
/** With the modify-times flag set and a non-zero start offset, the date and
 * time given out are the start advanced by the offset, and the offset given
 * is 0; otherwise the stored texts and offset. */
TOVA_API int32_t TOVA_CALL grdGetEqCalendarAxis(HeaderHandle header, int32_t* unit, const char** unitText,
                                                const char** startDate, const char** startTime,
                                                double* startOffset, double* timeStep, int32_t* noOfTimeSteps,
                                                int32_t* firstIndex);
/** As grdGetEqCalendarAxis for a non-equidistant calendar axis (kind 4). */
TOVA_API int32_t TOVA_CALL grdGetNeqCalendarAxis(HeaderHandle header, int32_t* unit, const char** unitText,
                                                 const char** startDate, const char** startTime,
                                                 double* startOffset, double* timeStep, int32_t* noOfTimeSteps,
                                                 int32_t* firstIndex);
/** Time covered by the file's time steps; -1e-255 when the header has no time
 * axis. */
TOVA_API int32_t TOVA_CALL _grdGetTimeAxisSpan(HeaderHandle header, FileHandle file, double* span);

/* ---- File lifecycle --------------------------------------------------------
 * A data file holds the header stream, then the static items, then the
 * dynamic time-step data. Opening yields a header and a file handle; every
 * later call takes both. Bad names are refused with a status and never
 * reported (create 2002, read 2003, delete 1000). */
/** Creates a gridded data file (replacing one of the same name; missing folders are made) and writes the
 * header. The caller keeps the header and passes it with the file to every later call. @param name file name.
 * @param header the header to write. @param file receives the open file, null on failure. @return 0; 2002 for
 * a null or empty name or a folder; 2003 when the file cannot be created; the header check's status (1000,
 * 2010) for a header that is not complete.
 */
TOVA_API int32_t TOVA_CALL grdFileCreate(const char* name, HeaderHandle header, FileHandle* file);
/** readable non-zero: the file may also be read back while it is written. */
TOVA_API int32_t TOVA_CALL grdFileCreateEx(const char* name, HeaderHandle header, FileHandle* file,
                                           int32_t readable);
/** Opens a gridded data file for reading and reads its header. @param name file name (a shell shortcut is
 * followed). @param header receives a new header, freed by the caller with grdHeaderDestroy. @param file
 * receives the open file, closed with grdFileClose. @return 0; 2003 for a missing file, a folder or a file
 * that cannot be opened; 2014 not a record file; 2017 not a gridded data file; the header reader's status for
 * a damaged header. On failure both out handles are null.
 */
TOVA_API int32_t TOVA_CALL grdFileRead(const char* name, HeaderHandle* header, FileHandle* file);
/** Opens a gridded data file for reading and writing (header and data from the cursor); arguments and
 * statuses as grdFileRead.
 */
TOVA_API int32_t TOVA_CALL grdFileEdit(const char* name, HeaderHandle* header, FileHandle* file);
/** Opens a gridded data file to add time steps after its last counted one (after the last complete one of a
 * file recovered with grdFileRecover); the cursor stands after them. Arguments and statuses as
 * grdFileRead. */
TOVA_API int32_t TOVA_CALL grdFileAppend(const char* name, HeaderHandle* header, FileHandle* file);
/** Hands every value written so far to the operating system (it then survives the end of the process, a
 * crash or a kill included) and brings the header on disk up to date (time-step count, time axis,
 * statistics), so that a reader, or grdFileRecover after a crash, finds the time steps written so far. The
 * flush always happens; once two time steps are written, a header update less than a second after the last
 * one is skipped (the header may then count fewer steps than the file holds, which grdFileRecover or
 * `tova repair` put right), so it may be called after every time step. 1000 for null handles; 2005 when the
 * stream flush fails; 2002 (or 2005) when an earlier write failed: the values from that write on are not in
 * the file; 2015 for a file open for reading. */
TOVA_API int32_t TOVA_CALL grdFileFlush(HeaderHandle header, FileHandle file);
/** As grdFileFlush, rewriting only the time information of the header. */
TOVA_API int32_t TOVA_CALL grdFileFlushTimeStep(HeaderHandle header, FileHandle file);
/** Durability against power loss, for checkpoints: as grdFileFlush, but the header is always brought up to
 * date, and then the system writes the file to its storage device (fsync; FlushFileBuffers on Windows).
 * Costs a device write: not for every time step. grdFileClose, by contrast, leaves the values with the
 * system as a flush does. Statuses as grdFileFlush; 2005 also when the device write fails; 2015 for a file
 * open for reading. */
TOVA_API int32_t TOVA_CALL grdFileSync(HeaderHandle header, FileHandle file);
/** Rewrites the header of a writable file, then closes it and nulls *file.
 * When the final header update fails the file stays open (retry possible);
 * a caller that gives up releases it with rcfFileClose(file). */
TOVA_API int32_t TOVA_CALL grdFileClose(HeaderHandle header, FileHandle* file);
/** Deletes a file (a shell shortcut is followed: its target is deleted). 1000 for a null or empty name, a
 * path that does not exist or a folder; otherwise 0, whatever the deletion's result. */
TOVA_API int32_t TOVA_CALL grdFileDelete(const char* name);

/* ---- Beyond the file-lifecycle calls: recovery after a crash ---------------
 * A writer killed before it closed its file leaves every time step it had
 * completely written on disk, but the header may count fewer (it is
 * rewritten at most once a second) and an unfinished time step may follow.
 * A time step is complete when its time-step block and every item record are
 * whole. Both calls walk the dynamic data record by record without reading
 * the values, and trust no count or length of the file. Out pointers may be
 * null. Statuses: 0, or the reader's status for a file damaged before its
 * dynamic data; 2018 for file types whose time steps are not of fixed
 * layout (only file types 1 and 4 are walked). */
/** Counts without changing the file: complete time steps, time steps the
 * header counts, and in *tailBytes the bytes that follow the last complete
 * time step (an unfinished one; 0 when the file ends with a complete step). */
TOVA_API int32_t TOVA_CALL grdFileScan(const char* name, int32_t* stepsFound, int32_t* stepsInHeader,
                                       int64_t* tailBytes);
/** As grdFileScan, then, when the header's time-step count (or, for a
 * non-equidistant axis, its time span) disagrees with the complete time
 * steps, rewrites them in place. A consistent file is not modified. A
 * trailing unfinished time step stays on disk, uncounted; grdFileAppend
 * continues after the last complete time step. 2010 when the header, read
 * back after the update, still disagrees (a damaged header). */
TOVA_API int32_t TOVA_CALL grdFileRecover(const char* name, int32_t* stepsFound, int32_t* stepsInHeader);

/* ---- Static items ------------------------------------------------------------
 * A static item is an item that carries its own values; it is usable
 * wherever an ItemHandle is taken (info and axis setters and getters). */
/** Makes an empty static item: set its info (grdSetItemInfo) and axis, link it to the header
 * (grdStaticSetHeader), write it (grdStaticWrite) and free it with grdStaticDestroy. 2000 when memory fails.
 */
TOVA_API int32_t TOVA_CALL grdStaticCreate(ItemHandle* staticItem);
/** Frees a static item and its values and sets *staticItem to null. 1000 for a null item. */
TOVA_API int32_t TOVA_CALL grdStaticDestroy(ItemHandle* staticItem);
/** Links a static item to the header whose delete values and unit settings it uses; a link already made is
 * kept. 1000 for null handles.
 */
TOVA_API int32_t TOVA_CALL grdStaticSetHeader(HeaderHandle header, ItemHandle staticItem);
/** Writes a static item with its values (item's simple type, grdGetItemElements values) after the header and
 * before the first time step. 1000 once time steps have been written; 2010 for an undefined or time-varying
 * axis; the write status otherwise.
 */
TOVA_API int32_t TOVA_CALL grdStaticWrite(ItemHandle staticItem, FileHandle file, const void* values);
/** The next static item of the file (destroy it with grdStaticDestroy), or
 * null at the end of the static section (status 0) or on failure. */
TOVA_API ItemHandle TOVA_CALL grdStaticRead(FileHandle file, int32_t* status);
/** Copies the static item's values into buffer (grdGetItemBytes bytes), converted by its unit conversion
 * mode. 2010 for a null buffer, 1000 for a null item.
 */
TOVA_API int32_t TOVA_CALL grdStaticGetData(ItemHandle staticItem, void* buffer);
/** Passes over the next static item without keeping it. 0 also at the end of the static items. */
TOVA_API int32_t TOVA_CALL grdStaticSkip(FileHandle file);

/* ---- Dynamic time-step data --------------------------------------------------
 * Calls never name an item or a time step: the header's cursor (next item,
 * time steps done) decides, and every write, read or skip advances it.
 * A file handle belongs to the header it was created with or read into:
 * these calls, positioning, flush, close and grdEnablePlugin refuse a file
 * of another header with 1000 and change nothing. */
/** Optional: starts the dynamic data explicitly. grdWriteItemTimeStep does it by itself before the first time
 * step; call it only to end the static section of a file that gets no time step now. 2015 for a file open for
 * reading, 2018 for file types other than 1 and 4.
 */
TOVA_API int32_t TOVA_CALL grdWriteStartBlockDynamic(HeaderHandle header, FileHandle file);
/** Writes the values of the next item of the current time step (the header's cursor decides which) and
 * advances the cursor; after the last item the time step is complete. @param header the file's header,
 * which holds the cursor. @param file the open file. @param time the time step's time: ignored but for the
 * first item of a time step, and stored only for the non-equidistant file types (4, 8, 16), where it is
 * the time in the time axis's unit (for a calendar axis: after its start date and time). The equidistant
 * types 1 and 2 store no time: pass the step's time or its index, as you like. @param data
 * grdGetItemElements values of the item's simple type, x fastest; delete values mark missing ones. The
 * caller's array is not changed. @return 0; 2015 for a file open for reading; 2018 for file types other
 * than 1 and 4; 2007 when the cursor is past the items; the write status otherwise. A failed write does
 * not advance the cursor. */
TOVA_API int32_t TOVA_CALL grdWriteItemTimeStep(HeaderHandle header, FileHandle file, double time,
                                                const void* data);
/** data may be null: the item's values are skipped. */
TOVA_API int32_t TOVA_CALL grdReadItemTimeStep(HeaderHandle header, FileHandle file, double* time, void* data);
/** Passes over the next item of the current time step without reading its values and advances the cursor.
 * Statuses as grdReadItemTimeStep.
 */
TOVA_API int32_t TOVA_CALL grdSkipItem(HeaderHandle header, FileHandle file);
/** Passes over the rest of the current time step (every item still to come). Statuses as grdSkipItem. */
TOVA_API int32_t TOVA_CALL grdSkipTimeStep(HeaderHandle header, FileHandle file);
/** Rounds the used elements of item itemNo in place to digits significant
 * decimal digits; delete values and zeros stay. Always 0. */
TOVA_API int32_t TOVA_CALL grdTruncateItemTimeStep(HeaderHandle header, int32_t itemNo, int32_t digits, void* data);

/** Placeholders for time-varying and free-item data: they do nothing and
 * return 1. */
TOVA_API int32_t TOVA_CALL grdWriteItemTvarTimeStep(HeaderHandle header, FileHandle file, double time,
                                                    const void* coordinates, const void* data);
/** Placeholder for time-varying data: does nothing, returns 1. */
TOVA_API int32_t TOVA_CALL grdReadItemTvarTimeStep(HeaderHandle header, FileHandle file, double* time,
                                                   void* coordinates, void* data);
/** Placeholder for free-item data: does nothing, returns 1. */
TOVA_API int32_t TOVA_CALL grdQueryFreeItemTimeStep(HeaderHandle header, FileHandle file, int32_t* itemNo,
                                                    int32_t* elements);
/** Placeholder for free-item data: does nothing, returns 1. */
TOVA_API int32_t TOVA_CALL grdQueryFreeItemTvarTimeStep(HeaderHandle header, FileHandle file, int32_t* itemNo,
                                                        int32_t* elements);
/** Placeholder for free-item data: does nothing, returns 1. */
TOVA_API int32_t TOVA_CALL grdReadFreeItemTimeStep(HeaderHandle header, FileHandle file, double* time,
                                                   int32_t* itemNo, void* data);
/** Placeholder for free-item data: does nothing, returns 1. */
TOVA_API int32_t TOVA_CALL grdReadFreeItemTvarTimeStep(HeaderHandle header, FileHandle file, double* time,
                                                       int32_t* itemNo, void* coordinates, void* data);
/** Placeholder for free-item data: does nothing, returns 1. */
TOVA_API int32_t TOVA_CALL grdWriteFreeItemTimeStep(HeaderHandle header, FileHandle file, double time,
                                                    int32_t itemNo, int32_t elements, const void* data);
/** Placeholder for free-item data: does nothing, returns 1. */
TOVA_API int32_t TOVA_CALL grdWriteFreeItemTvarTimeStep(HeaderHandle header, FileHandle file, double time,
                                                        int32_t itemNo, int32_t elements, const void* coordinates,
                                                        const void* data);

/* ---- Positioning ----------------------------------------------------------------
 * 1001 (time step out of range) and 1002 (no such item or static item) are
 * returned without calling any handler. */
/** Moves the file to the next logical block with code blockCode: 40000 (start of the static items) and 50000
 * (start of the dynamic data) search from the start of their section. Not finding the block is no error: 0,
 * with the file at its end; the file's pending error otherwise. */
TOVA_API int32_t TOVA_CALL grdFindBlock(FileHandle file, int32_t blockCode);
/** Moves the file to the start of its static items. Optional: reading starts there anyway. */
TOVA_API int32_t TOVA_CALL grdFindBlockStatic(HeaderHandle header, FileHandle file);
/** Moves the file to the start of its dynamic data (time step 0, item 1) and resets the cursor. Optional: the
 * first read of a time step after the static items finds it by itself.
 */
TOVA_API int32_t TOVA_CALL grdFindBlockDynamic(HeaderHandle header, FileHandle file);
/** Moves the file to static item staticItemNo (1-based), so that grdStaticRead reads it. 1002 when there is
 * no such static item.
 */
TOVA_API int32_t TOVA_CALL grdFindItemStatic(HeaderHandle header, FileHandle file, int32_t staticItemNo);
/** Moves the file and the cursor to time step timeStep (0-based), item 1, without reading the time steps
 * before it (their size is known from the header). 1001 when timeStep is negative or above the number of time
 * steps (equal is the position after the last one).
 */
TOVA_API int32_t TOVA_CALL grdFindTimeStep(HeaderHandle header, FileHandle file, int32_t timeStep);
/** Moves the file and the cursor to item itemNo (1-based) of time step timeStep. 1001 and 1002 as
 * grdFindTimeStep and for an item number outside 1 to grdGetNoOfItems.
 */
TOVA_API int32_t TOVA_CALL grdFindItemDynamic(HeaderHandle header, FileHandle file, int32_t timeStep,
                                              int32_t itemNo);

/* ---- Statistics ------------------------------------------------------------------ */
/** Per-element statistics (statistics types 2 and 3); element is 0-based.
 * Every out pointer is optional. */
TOVA_API int32_t TOVA_CALL grdGetItemStats(HeaderHandle header, int32_t itemNo, int32_t element, double* minimum,
                                           double* maximum, double* mean, double* stdDev, double* autoCorrelation,
                                           int32_t* values, int32_t* deletes, int32_t* pairs);
/** Item-global statistics kept while the file was written: smallest and largest value and the number of
 * delete values over all time steps. 1000 for a null item.
 */
TOVA_API int32_t TOVA_CALL grdGetItemStatsGlobal(ItemHandle item, double* minimum, double* maximum,
                                                 int32_t* deletes);

/* ---- Extension plug-ins ------------------------------------------------------
 * A file opened with grdFileRead can be given the extension library that its
 * data type selects: "grdExt_<n>" with the platform's suffix (.so, .dylib,
 * .dll), n the absolute value of the data type, found by the platform
 * loader's standard search only (never in the data file's folder). It is
 * loaded only by grdEnablePlugin. The plug-in replaces the header's items by
 * its own list (copies of the file's items and items it derives); from then
 * on every dynamic read and skip goes through it. Writing a plug-in:
 * grdext.h. */

/** Loads the plug-in of the header's data type for file. Returns 0, or the
 * non-zero status that the plug-in's last description call returned (the
 * plug-in is loaded in both cases); -1 when refused: the file is not open for
 * reading only, a plug-in is already loaded, the cursor stands inside a time
 * step, a required entry point is missing, its initialisation fails or an
 * axis it describes is out of range (the header is left unchanged); -2 when the data type is 0; -3 when the
 * library cannot be loaded. -1, -2 and -3 are returned, never reported.
 * Item handles taken before a successful call are no longer valid. */
TOVA_API int32_t TOVA_CALL grdEnablePlugin(HeaderHandle header, FileHandle file);
/** Calls the plug-in's grdExtTerminate (its result is returned; 0 without
 * one) and unloads the library. The plug-in's items stay in the header; they
 * describe the plug-in, not the file, which is read again by reopening it.
 * 0 when no plug-in is loaded. The header's destruction unloads a plug-in
 * the same way. */
TOVA_API int32_t TOVA_CALL grdUnloadPlugin(HeaderHandle header);
/** The dynamic-data cursor: the item (1-based) that the next read, write or
 * skip concerns, and the number of time steps done. Lets a plug-in tell
 * which item grdExtReadItemTimeStep is asked for. */
TOVA_API int32_t TOVA_CALL grdGetItemCursor(HeaderHandle header, int32_t* nextItemNo, int32_t* timeStepsDone);

TOVA_EXTERN_C_END

#endif /* TOVA_GRD_H */
