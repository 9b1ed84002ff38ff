/** @file
 * tova — status codes, the opaque handles shared by every API family, the
 * export and calling-convention macros and the user error-handler type.
 * Every other public header includes this one.
 */
#ifndef TOVA_STATUS_H
#define TOVA_STATUS_H

#include <stddef.h>
#include <stdint.h>

/* Calling convention of every exported function and of the handler type:
 * callee-pops on 32-bit Windows, the platform default everywhere else. */
#if defined(_WIN32) && !defined(_WIN64)
/** Calling convention of every exported function and of the handler type: __stdcall (callee pops) on 32-bit
 * Windows, the platform default elsewhere.
 */
#define TOVA_CALL __stdcall
#else
/** Calling convention of every exported function and of the handler type: __stdcall (callee pops) on 32-bit
 * Windows, the platform default elsewhere.
 */
#define TOVA_CALL
#endif

/* Symbol visibility: only what is marked TOVA_API leaves the shared library. */
#if defined(TOVA_STATIC_DEFINE)
/** Marks the exported functions of libtova. */
#define TOVA_API
#elif defined(_WIN32)
#if defined(TOVA_BUILDING)
/** Marks the exported functions of libtova. */
#define TOVA_API __declspec(dllexport)
#else
/** Marks the exported functions of libtova. */
#define TOVA_API __declspec(dllimport)
#endif
#else
/** Marks the exported functions of libtova. */
#define TOVA_API __attribute__((visibility("default")))
#endif

#ifdef __cplusplus
/** Opens C linkage for the declarations of a header included from C++. */
#define TOVA_EXTERN_C_BEGIN extern "C" {
/** Closes the C linkage opened by TOVA_EXTERN_C_BEGIN. */
#define TOVA_EXTERN_C_END }
#else
/** Opens C linkage for the declarations of a header included from C++. */
#define TOVA_EXTERN_C_BEGIN
/** Closes the C linkage opened by TOVA_EXTERN_C_BEGIN. */
#define TOVA_EXTERN_C_END
#endif

TOVA_EXTERN_C_BEGIN

/** An open record file (all file kinds). Freed only by the close operations. */
typedef struct RcfFile* FileHandle;
/** The in-memory header of one gridded data file. */
typedef struct GrdHeader* HeaderHandle;

/* Status codes. 0 is success; 1 is the record layer's end-of-file state. */
enum {
    F_NO_ERROR = 0,
    F_EOF = 1,                 /**< end of file met (record layer; never reported) */
    F_ERR_ARGUMENT = 1000,     /**< null handle/pointer, or an argument of the wrong kind */
    F_ERR_TIMESTEP_RANGE = 1001, /**< positioning: time-step index out of range */
    F_ERR_ITEM_RANGE = 1002,   /**< positioning: no such item or static item */
    F_ERR_MEMORY = 2000,       /**< allocation failed */
    F_ERR_READ = 2001,         /**< no typed block where expected; stream read failed */
    F_ERR_WRITE = 2002,        /**< fewer bytes written than asked */
    F_ERR_OPEN = 2003,         /**< the file could not be opened */
    F_ERR_CLOSE = 2004,        /**< the stream close failed */
    F_ERR_FLUSH = 2005,        /**< flushing buffers to disk failed */
    F_ERR_SEEK = 2006,         /**< positioning failed */
    F_ERR_ITEMNO = 2007,       /**< item number out of range */
    F_ERR_ELEMENT = 2008,      /**< element index out of range */
    F_ERR_TYPE = 2009,         /**< record or block of the wrong type */
    F_ERR_VALUE = 2010,        /**< value not valid or not supported here */
    F_ERR_DATE_FORMAT = 2011,  /**< date text could not be parsed */
    F_ERR_TIME_FORMAT = 2012,  /**< time-of-day text could not be parsed */
    F_ERR_SIZE = 2013,         /**< right type, wrong size or count */
    F_ERR_NOT_RCF = 2014,      /**< not a record file */
    F_ERR_READONLY = 2015,     /**< write asked of a file open for reading */
    F_ERR_NOT_BLOCK = 2016,    /**< next record is not a block start */
    F_ERR_APP_TAG = 2017,      /**< application tag does not match */
    F_ERR_DATA_TYPE = 2018,    /**< invalid data type / operation not allowed for the file type */
    F_ERR_SKIP = 2019,         /**< a skip did not land on a valid record */
    F_ERR_UNIT = 2020          /**< unit not valid for the item's quantity type */
};

/** The fixed text of a status code: its name, a colon and its meaning, e.g.
 * "F_ERR_OPEN: the file could not be opened"; "unknown status" for a code
 * outside the table. The text is static: never freed, valid for the life of
 * the library, safe from any thread. */
TOVA_API const char* TOVA_CALL grdGetStatusText(int32_t status);

/** User error handler: a notification hook called with the context of a
 * failure before the status is returned to the caller. The return value is
 * ignored. */
typedef int32_t(TOVA_CALL* grdErrorHandler)(HeaderHandle header, FileHandle file, int32_t extra,
                                            int32_t code, const char* module, int32_t line);

TOVA_EXTERN_C_END

#endif /* TOVA_STATUS_H */
