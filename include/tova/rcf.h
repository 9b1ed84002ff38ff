/** @file
 * tova — the record-file layer. A record file is a fixed file header (tag,
 * application tag, banner, stamps and versions) followed by typed logical
 * records and blocks of records. Gridded data, cross-section and VRE files are
 * all record files. Multi-byte values are stored in the writer's byte order; a
 * file of the opposite order is read (and written) with every element swapped.
 */
#ifndef TOVA_RCF_H
#define TOVA_RCF_H

#include "status.h"

TOVA_EXTERN_C_BEGIN

/* Simple type codes of logical records. */
enum {
    RCF_BLOCK = -2,       /**< start of a logical block (no elements) */
    RCF_TERMINATOR = -1,  /**< end of a logical block (no elements) */
    RCF_UNKNOWN = 0,
    RCF_FLOAT = 1,        /**< IEEE single */
    RCF_DOUBLE = 2,       /**< IEEE double */
    RCF_BYTE = 3,
    RCF_INT4 = 4,         /**< signed 32-bit, "integer*4" */
    RCF_UINT4 = 5,        /**< unsigned 32-bit, "unsigned*4" */
    RCF_INT2 = 6,         /**< signed 16-bit, "integer*2" */
    RCF_UINT2 = 7         /**< unsigned 16-bit, "unsigned*2" */
};

/** Application callback given to the open operations: writes the application's
 * version into *version and returns its 4-byte tag as a 32-bit value. */
typedef uint32_t (*rcfAppIdent)(uint32_t* version);

/** A callback may return this value to accept a file of any application. */
#define RCF_ACCEPT_ANY_APP 0x1A9B8C1Au

/** Opens a record file of any kind for reading its records. @param path file name. @param out receives the
 * handle (close it with rcfFileClose). @param appIdent the caller's application callback; it may return
 * RCF_ACCEPT_ANY_APP. @param appTagOut receives the file's application tag; may be null. @return 0, 1000 for
 * a null argument, 2003 when the file cannot be opened, 2014 for a file that is not a record file, 2017 for
 * another application's file.
 */
TOVA_API int32_t TOVA_CALL rcfFileOpenRead(const char* path, FileHandle* out, rcfAppIdent appIdent,
                                           uint32_t* appTagOut);
/** Closes a record file and sets *handle to null. @return 0, or 2004 when the stream close fails; 1000 for a
 * null handle.
 */
TOVA_API int32_t TOVA_CALL rcfFileClose(FileHandle* handle);

/** The file's pending (sticky) error, which is then cleared: after a failure every transfer does nothing
 * until the error is taken.
 */
TOVA_API int32_t TOVA_CALL rcfGetError(FileHandle handle);
/** The file's pending error, left as it is. */
TOVA_API int32_t TOVA_CALL rcfPeekError(FileHandle handle);

/** Offset of the first record after the file header. */
TOVA_API uint32_t TOVA_CALL rcfGetRCFbase(FileHandle handle);
/** Offset at which the application's records begin. */
TOVA_API uint32_t TOVA_CALL rcfGetAppBase(FileHandle handle);
/** Full path of the open file; lent by the handle, valid until it is closed. */
TOVA_API const char* TOVA_CALL rcfGetFilename(FileHandle handle);
/** Record-layer version of the library that created the file. */
TOVA_API uint32_t TOVA_CALL rcfGetVersionCreate(FileHandle handle);
/** Record-layer version of the library that last wrote the file. */
TOVA_API uint32_t TOVA_CALL rcfGetVersionEdit(FileHandle handle);
/** Application version of the creator (e.g. 206 for gridded data files). */
TOVA_API uint32_t TOVA_CALL rcfGetVersionCreateApp(FileHandle handle);
/** Application version of the last writer. */
TOVA_API uint32_t TOVA_CALL rcfGetVersionEditApp(FileHandle handle);
/** The record-layer version this library writes. */
TOVA_API uint32_t TOVA_CALL rcfGetVersionCurrent(void);

/** Texts "YYYY-MM-DD" and "hh:mm:ss", made on first call and cached in the
 * handle until it is closed. */
TOVA_API const char* TOVA_CALL rcfGetFileCreationDate(FileHandle handle);
/** Creation time of day "hh:mm:ss"; cached in the handle until it is closed. */
TOVA_API const char* TOVA_CALL rcfGetFileCreationTime(FileHandle handle);
/** Date of the last edit "YYYY-MM-DD"; cached in the handle until it is closed. */
TOVA_API const char* TOVA_CALL rcfGetFileEditDate(FileHandle handle);
/** Time of day of the last edit "hh:mm:ss"; cached in the handle until it is closed. */
TOVA_API const char* TOVA_CALL rcfGetFileEditTime(FileHandle handle);

/** Name of a simple type code ("float", "double", "byte", "integer*4", ...); static text. */
TOVA_API const char* TOVA_CALL rcfSimpName(int32_t code);
/** Size in bytes of one element of a simple type; 0 for block codes and unknown codes. */
TOVA_API uint16_t TOVA_CALL rcfSimpSize(int32_t code);
/** Non-zero for the element types 1-7. */
TOVA_API int32_t TOVA_CALL rcfSimpValid(int32_t code);

/** Writes one data record; returns the file's error state afterwards. */
TOVA_API int32_t TOVA_CALL rcfLrecWrite(FileHandle handle, int32_t type, uint32_t count, const void* data);
/** Reads the next data record into buffer; returns its element count or 0. */
TOVA_API uint32_t TOVA_CALL rcfLrecRead(FileHandle handle, int32_t type, uint32_t maxCount, void* buffer);
/** Reads the next data record into a new buffer, freed with rcfLrecFree. */
TOVA_API void* TOVA_CALL rcfLrecReadAlloc(FileHandle handle, int32_t* type, uint32_t* count);
/** Frees a buffer from rcfLrecReadAlloc and sets *buffer to null; null is allowed. */
TOVA_API void TOVA_CALL rcfLrecFree(void** buffer);

/** Type of the next record, not consumed. For a block start *count is the
 * block identifier. */
TOVA_API int32_t TOVA_CALL rcfQuery(FileHandle handle, uint32_t* count);
/** Skips the next record (a block start or terminator alone); returns its type. */
TOVA_API int32_t TOVA_CALL rcfSkip(FileHandle handle);

/** origin: 0 start, 1 current, 2 end. */
TOVA_API void TOVA_CALL rcfSeek64(FileHandle handle, uint32_t offsetLow, uint32_t offsetHigh, int32_t origin);
/** Logical position (moves the stream there as a side effect). */
TOVA_API int64_t TOVA_CALL rcfTell64(FileHandle handle);
/** The stream's raw 32-bit position, with no allowance for look-ahead. */
TOVA_API int32_t TOVA_CALL rcfTell(FileHandle handle);

TOVA_EXTERN_C_END

#endif /* TOVA_RCF_H */
