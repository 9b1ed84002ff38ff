// Platform layer, POSIX side (Linux, macOS): 64-bit stdio positions through
// fseeko/ftello, folders and full paths through std::filesystem ('/' separates
// path components, a backslash is an ordinary character), shared libraries
// through dlopen. No host project window exists and shell shortcuts are
// ordinary files.
#if !defined(_FILE_OFFSET_BITS)
#define _FILE_OFFSET_BITS 64
#endif

#include "platform/platform.h"

#include <filesystem>
#include <string>
#include <system_error>

#include <dlfcn.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <unistd.h>

namespace platform {

namespace {
constexpr int32_t kNotImplemented = static_cast<int32_t>(0x80004001u);
}

static_assert(sizeof(off_t) >= 8, "record files need 64-bit stream positions");

std::FILE* streamOpen(const char* path, const char* mode) {
    // 'e': the stream is not inherited by child processes.
    std::string withCloseOnExec = mode;
    withCloseOnExec += 'e';
    return std::fopen(path, withCloseOnExec.c_str());
}

int streamSeek(std::FILE* f, int64_t offset, int whence) { return fseeko(f, static_cast<off_t>(offset), whence); }

int64_t streamTell(std::FILE* f) { return static_cast<int64_t>(ftello(f)); }

int64_t streamLength(std::FILE* f) {
    struct stat st;
    return fstat(fileno(f), &st) == 0 ? static_cast<int64_t>(st.st_size) : -1;
}

bool streamTruncate(std::FILE* f, int64_t length) {
    return ftruncate(fileno(f), static_cast<off_t>(length)) == 0;
}

bool streamSync(std::FILE* f) { return std::fflush(f) == 0 && fsync(fileno(f)) == 0; }

bool localNow(std::tm& out) {
    const std::time_t now = std::time(nullptr);
    return localtime_r(&now, &out) != nullptr;
}

// Absolute and lexically normalised.
std::string fullPath(const char* path) {
    std::error_code ec;
    const std::filesystem::path absolute = std::filesystem::absolute(std::filesystem::path(path), ec);
    return ec ? std::string(path) : absolute.lexically_normal().string();
}

PathKind pathKind(const char* path) {
    std::error_code ec;
    const auto st = std::filesystem::status(std::filesystem::path(path), ec);
    if (ec || !std::filesystem::exists(st)) return PathKind::Missing;
    return std::filesystem::is_directory(st) ? PathKind::Directory : PathKind::File;
}

int32_t createFolderOf(const char* filePath) {
    try {
        const std::filesystem::path folder = std::filesystem::absolute(filePath).parent_path();
        std::error_code ec;
        std::filesystem::create_directories(folder, ec);
        if (ec) return 0;
        return std::filesystem::is_directory(folder, ec) ? 1 : 0;
    } catch (...) {
        return 0;
    }
}

#if defined(__APPLE__)
const char* const kSharedLibrarySuffix = ".dylib";
#else
const char* const kSharedLibrarySuffix = ".so";
#endif

void* libraryLoad(const char* name) { return dlopen(name, RTLD_NOW | RTLD_LOCAL); }

AnyFunction librarySymbol(void* library, const char* name) {
    return reinterpret_cast<AnyFunction>(dlsym(library, name));
}

void libraryFree(void* library) { dlclose(library); }

int32_t sendCopyData(uintptr_t, const char*) { return -1; }

bool shortcutsResolve() { return false; }

int32_t resolveShortcut(const char*, char* target) {
    if (target != nullptr) target[0] = '\0';
    return kNotImplemented;
}

}  // namespace platform
