/** @file
 * tova — workspace helpers for applications that use the library inside a
 * larger workspace: create the folder that will hold a file, announce a new
 * file to a host project window, recognise and resolve shell shortcuts.
 * They share no state with the rest of the library and use no status codes:
 * each reports through its result.
 */
#ifndef TOVA_WORKSPACE_H
#define TOVA_WORKSPACE_H

#include "status.h"

TOVA_EXTERN_C_BEGIN

/** Makes sure every folder above filePath exists: 1 when created or already
 * there, else 0. Relative paths are taken from the current directory. */
TOVA_API int32_t TOVA_CALL TdCreateFolder(const char* filePath);

/** Tells the host project window named by the environment variable
 * "TDPROJECTXXXXX" about filePath; returns the host's answer, or -1 when there
 * is no host (always -1 where no host window exists, i.e. outside Windows). */
TOVA_API int32_t TOVA_CALL TdProject_AddFile(const char* filePath);

/** 1 when the path's extension is ".lnk" in any case, else 0. */
TOVA_API int32_t TOVA_CALL TdShortCut_IsShortcut(const char* path);

/** Writes the target of a shell shortcut into target (room for at least 260
 * characters); target is "" on failure. Returns the result of the last step
 * performed, negative on failure; 0x80004001 (not implemented) outside
 * Windows. */
TOVA_API int32_t TOVA_CALL TdShortCut_ResolveShortcut(const char* linkPath, char* target);

TOVA_EXTERN_C_END

#endif /* TOVA_WORKSPACE_H */
