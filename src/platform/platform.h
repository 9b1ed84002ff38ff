// Platform layer: the few operating-system services the library needs, behind
// one interface. platform_posix.cpp implements it on Linux and other POSIX
// systems, platform_win32.cpp on Windows; the build compiles exactly one of
// them. Nothing else in the library includes system headers of its own for
// these services.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <string>

namespace platform {

// ---- Streams -----------------------------------------------------------------

// A file is used by one thread at a time, so the transfers take the stream
// functions that skip the stream's lock where the C library has them: for
// small records the lock costs as much as the copy. Inline: they are on the
// hot path of every record.
#if defined(_WIN32)
// The system C runtime (msvcrt) has no unlocked block transfers.
inline size_t streamRead(void* p, size_t n, std::FILE* f) { return std::fread(p, 1, n, f); }
inline size_t streamWrite(const void* p, size_t n, std::FILE* f) { return std::fwrite(p, 1, n, f); }
inline int streamGetc(std::FILE* f) { return _getc_nolock(f); }
#elif defined(__GLIBC__)
inline size_t streamRead(void* p, size_t n, std::FILE* f) { return fread_unlocked(p, 1, n, f); }
inline size_t streamWrite(const void* p, size_t n, std::FILE* f) { return fwrite_unlocked(p, 1, n, f); }
inline int streamGetc(std::FILE* f) { return getc_unlocked(f); }
#else
inline size_t streamRead(void* p, size_t n, std::FILE* f) { return std::fread(p, 1, n, f); }
inline size_t streamWrite(const void* p, size_t n, std::FILE* f) { return std::fwrite(p, 1, n, f); }
inline int streamGetc(std::FILE* f) { return getc_unlocked(f); }
#endif

// Opens a binary stream with an fopen mode ("wb+", "wb", "rb+", "rb"). Where
// the system allows it the stream is not inherited by child processes.
// Returns null on failure.
std::FILE* streamOpen(const char* path, const char* mode);

// 64-bit positioning: fseek semantics (0 on success) and the position (-1 on
// failure), valid beyond 2 GiB on every platform.
int streamSeek(std::FILE* f, int64_t offset, int whence);
int64_t streamTell(std::FILE* f);

// The length of the file behind the stream, -1 when it cannot be had.
int64_t streamLength(std::FILE* f);

// Cuts the file behind the stream at length bytes. The caller flushes the
// stream first. True on success.
bool streamTruncate(std::FILE* f, int64_t length);

// Flushes the stream and has the system put the file on its storage device
// (durability against power loss). True on success.
bool streamSync(std::FILE* f);

// ---- Time ----------------------------------------------------------------------

// The current local time; false when the system cannot give it.
bool localNow(std::tm& out);

// ---- Paths ---------------------------------------------------------------------

// The full (absolute) form of path; the path as given when it cannot be made.
std::string fullPath(const char* path);

enum class PathKind { Missing, File, Directory };

// What path names: nothing, a file (anything but a folder) or a folder.
PathKind pathKind(const char* path);

// Makes every missing folder above filePath (a relative path is taken from the
// current directory). 1 when they exist afterwards, else 0.
int32_t createFolderOf(const char* filePath);

// ---- Shared libraries ------------------------------------------------------------

// The file-name ending of shared libraries: ".dll", ".dylib" or ".so".
extern const char* const kSharedLibrarySuffix;

// Loads a shared library by bare file name through the system's standard
// search; null on failure. Freed by libraryFree.
void* libraryLoad(const char* name);

// A function of a loaded library by name, null when absent. The caller
// converts it to the function's real type.
using AnyFunction = void (*)();
AnyFunction librarySymbol(void* library, const char* name);

void libraryFree(void* library);

// ---- Workspace: host project window, shell shortcuts ------------------------------

// Sends the copy-data message { tag 1, text without its zero } to the host
// project window given by its handle; the window's answer, or -1 where no
// host windows exist.
int32_t sendCopyData(uintptr_t window, const char* text);

// Whether shell shortcuts (.lnk files) are resolved on this system; where
// they are not, a .lnk file is an ordinary file.
bool shortcutsResolve();

// Writes the target of the shortcut linkPath into target (room for 260
// characters; "" on failure) and returns the result of the last step, negative
// on failure.
int32_t resolveShortcut(const char* linkPath, char* target);

}  // namespace platform
