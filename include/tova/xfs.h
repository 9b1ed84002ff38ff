/*
 * tova — cross-section files. A cross-section file holds any number of cross
 * sections, each identified by a primary name, a secondary name and a numeric
 * key value, each carrying four optional data sets: raw points, a selection
 * list, processed rows and coordinates. A file is loaded into a table sorted
 * by (primary name, secondary name, key value), names compared without regard
 * to letter case; the table is searched and walked with the functions below.
 *
 * A cross-section handle points at the XsecData record of a cross section:
 * callers read it directly and fill its arrays after sizing them with the
 * xfsXsecSetNo... functions. Strings and arrays in the record are owned by the
 * cross section and live on the C heap (malloc/free); a caller that replaces
 * one must allocate the new one with malloc and must not free the old one
 * through any other allocator.
 */
#ifndef TOVA_XFS_H
#define TOVA_XFS_H

#include "status.h"

TOVA_EXTERN_C_BEGIN

/* The record of one cross section: a fixed binary interface, packed on 2-byte
 * boundaries with no padding. Byte offsets (32-bit pointers / 64-bit pointers):
 *
 *   keyValue         0 /   0    double             third search key
 *   primaryName      8 /   8    char*              first search key
 *   secondaryName   12 /  16    char*              second search key
 *   extraName       16 /  24    char*              free name, never null (default " ")
 *   headerWords     20 /  32    uint16_t[25]       kept and written unchanged
 *   headerValues    70 /  82    double[23]         kept and written unchanged
 *   noRaw          254 / 266    uint32_t           raw points
 *   raw[0..2]      258 / 270    double*[3]         raw columns 0-2
 *   noSel          270 / 294    uint32_t           selection values
 *   sel            274 / 298    double*            selection values
 *   noPrc          278 / 306    uint32_t           processed rows
 *   prc[0..5]      282 / 310    double*[6]         processed columns 0-5
 *   raw3           306 / 358    double*            raw column 3
 *   rawMark[0..1]  310 / 366    uint16_t*[2]       raw columns 4 and 5
 *   noCoords       318 / 382    uint32_t           coordinate points
 *   coords[0..2]   322 / 386    double*[3]         coordinate columns 0-2
 *   owner          334 / 410    void*              the owning object; do not change
 *   (size)         338 / 418
 *
 * Callers must be built with the same pointer width as the library. Every
 * array of a set holds the set's count of elements; a set with count 0 has no
 * arrays. Doubles behind the 2-byte packing are unaligned: access them through
 * the record's members (the compiler knows the packing), not through pointers
 * taken to the members.
 *
 * Header-word defaults: all 0 except word 23, which is 2. Header-value
 * defaults: 0-9 are 0.0, 10-14 are 1.0, 15 is 0.001, 16-22 are 1.0. */
#pragma pack(push, 2)
typedef struct XsecData {
    double keyValue;
    char* primaryName;
    char* secondaryName;
    char* extraName;
    uint16_t headerWords[25];
    double headerValues[23];
    uint32_t noRaw;
    double* raw[3];
    uint32_t noSel;
    double* sel;
    uint32_t noPrc;
    double* prc[6];
    double* raw3;
    uint16_t* rawMark[2];
    uint32_t noCoords;
    double* coords[3];
    void* owner;
} XsecData;
#pragma pack(pop)

/* A loaded cross-section file; owns its cross sections and its open file. */
typedef struct XsecTable* XsecTableHandle;
/* A cross section: the record inside it. */
typedef XsecData* XsecHandle;
/* A search cursor. Cursors belong to the library and live until it is
 * unloaded; callers never free them. */
typedef struct CTDxRef* XsecCursor;

/* Flag bit 0 of xfsXsecTableLoad: load keys and headers only, drop the data
 * sets. */
#define XFS_LOAD_KEYS_ONLY 0x1u

/* ---- Files ----------------------------------------------------------------- */

/* Creates (truncates) a cross-section file for writing: application tag
 * "XFS_", format version 106. 1000 for a null argument, else the record
 * layer's open status. */
TOVA_API int32_t TOVA_CALL xfsFileOpenCreate(const char* path, FileHandle* out);
/* The record-file close, get-error and peek-error under the family's names. */
TOVA_API int32_t TOVA_CALL xfsFileClose(FileHandle* handle);
TOVA_API int32_t TOVA_CALL xfsGetError(FileHandle handle);
TOVA_API int32_t TOVA_CALL xfsPeekError(FileHandle handle);

/* ---- Tables ---------------------------------------------------------------- */

/* Loads a cross-section file into a new sorted table (*out). Returns 0, 2000
 * when memory runs out, the record layer's status when the file cannot be
 * opened, is not a cross-section file or has a block cut short, or 2010 when a
 * header block yields no valid cross section; *out is null on failure. A data
 * block of the wrong shape makes only its cross section invalid: it stays in
 * the table, and finds and walks that reach it return null. flags: see
 * XFS_LOAD_KEYS_ONLY. The table keeps its file open until it is freed. */
TOVA_API int32_t TOVA_CALL xfsXsecTableLoad(const char* path, XsecTableHandle* out, uint32_t flags);
/* Frees the table, its cross sections and closes its file; nulls *table. */
TOVA_API void TOVA_CALL xfsXsecTableFree(XsecTableHandle* table);
/* The format version of the cross-section file opened last for loading (100
 * before any load). The table argument is ignored. */
TOVA_API int32_t TOVA_CALL xfsXsecTableVersion(XsecTableHandle table);

/* ---- Cross sections -------------------------------------------------------- */

/* A new cross section with the given keys (extra name " "), or null when a
 * name is null or memory runs out. Free it with xfsXsecFree. */
TOVA_API XsecHandle TOVA_CALL xfsXsecCreate(const char* primaryName, double keyValue, const char* secondaryName);
/* The same with an extra name; a null or empty extra name gives " ". */
TOVA_API XsecHandle TOVA_CALL xfsXsecCreateEx(const char* primaryName, double keyValue, const char* secondaryName,
                                              const char* extraName);
/* Destroys a cross section made by xfsXsecCreate(Ex) and nulls *xsec. A cross
 * section of a loaded table is left alone (it goes with its table). */
TOVA_API void TOVA_CALL xfsXsecFree(XsecHandle* xsec);

/* Sizes a data set: frees its arrays and, for a non-zero count, allocates new
 * zero-filled ones. Only the low 16 bits of count are used. Returns 1, or 0 for
 * an invalid or unknown cross section or when memory runs out (the cross
 * section is then invalid). */
TOVA_API int32_t TOVA_CALL xfsXsecSetNoCoords(XsecHandle xsec, uint32_t count);
TOVA_API int32_t TOVA_CALL xfsXsecSetNoPrc(XsecHandle xsec, uint32_t count);
TOVA_API int32_t TOVA_CALL xfsXsecSetNoRaw(XsecHandle xsec, uint32_t count);
TOVA_API int32_t TOVA_CALL xfsXsecSetNoSel(XsecHandle xsec, uint32_t count);

/* Writes the cross section at the file's current position: key and header
 * blocks, then each non-empty data set. Returns 1000 for an unknown cross
 * section or null file, 2010 when the record's names or arrays are missing,
 * the file's pending error (nothing written), else the file's error state
 * after writing. */
TOVA_API int32_t TOVA_CALL xfsXsecWrite(XsecHandle xsec, FileHandle file);

/* ---- Search and walk ------------------------------------------------------- */

/* Finds the first cross section with these keys (names without regard to
 * case, key value exactly) and leaves *cursor on the one after it. Two empty
 * names with key value 0.0 start a walk: the first cross section of the table
 * is returned. A cursor is made and stored in *cursor (when cursor is not
 * null) on every call, before anything else is checked. */
TOVA_API XsecHandle TOVA_CALL xfsXsecFind(XsecTableHandle table, const char* primaryName, double keyValue,
                                          const char* secondaryName, XsecCursor* cursor);
/* The cross section under the cursor, moving the cursor one on; null at the
 * end. Keys are not compared: the caller stops when they no longer match. */
TOVA_API XsecHandle TOVA_CALL xfsXsecFindNext(XsecTableHandle table, XsecCursor cursor);
/* The neighbour of xsec in the table, or null at either end, for a cross
 * section of another table, or when the neighbour is invalid. */
TOVA_API XsecHandle TOVA_CALL xfsXsecNext(XsecTableHandle table, XsecHandle xsec);
TOVA_API XsecHandle TOVA_CALL xfsXsecPrev(XsecTableHandle table, XsecHandle xsec);

TOVA_EXTERN_C_END

#endif /* TOVA_XFS_H */
