// Platform layer, Windows side: 64-bit stdio positions (_fseeki64/_ftelli64),
// full paths and folder tests through the Win32 ANSI calls (both '\' and '/'
// separate path components, drive letters and UNC names are understood),
// folders made by the shell, plug-ins through LoadLibraryA/GetProcAddress,
// the copy-data message to a host project window, and shell shortcuts (.lnk)
// resolved through the shell-link COM object.
#ifndef NOMINMAX
#define NOMINMAX
#endif
#include "platform/platform.h"

#include <cstring>
#include <string>
#include <vector>

#include <io.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <windows.h>
#include <objbase.h>
#include <shlobj.h>
#include <shlwapi.h>

namespace platform {

namespace {

// Folder and shortcut buffers: the shell's path length, with room to spare
// for the folder of a long relative name.
constexpr DWORD kPathChars = MAX_PATH;

// No error dialog box while a library is looked for: a missing plug-in is an
// ordinary result, not something to ask the user about.
class QuietErrors {
public:
    QuietErrors() { SetThreadErrorMode(SEM_FAILCRITICALERRORS | SEM_NOOPENFILEERRORBOX, &previous_); }
    ~QuietErrors() { SetThreadErrorMode(previous_, nullptr); }
    QuietErrors(const QuietErrors&) = delete;
    QuietErrors& operator=(const QuietErrors&) = delete;

private:
    DWORD previous_ = 0;
};

// COM for the calling thread for the life of the object, when the caller has
// not started it already (a thread in another apartment mode keeps its own).
class ComScope {
public:
    ComScope() : started_(SUCCEEDED(CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED))) {}
    ~ComScope() {
        if (started_) CoUninitialize();
    }
    ComScope(const ComScope&) = delete;
    ComScope& operator=(const ComScope&) = delete;

private:
    bool started_;
};

}  // namespace

std::FILE* streamOpen(const char* path, const char* mode) { return std::fopen(path, mode); }

int streamSeek(std::FILE* f, int64_t offset, int whence) { return _fseeki64(f, offset, whence); }

int64_t streamTell(std::FILE* f) { return _ftelli64(f); }

int64_t streamLength(std::FILE* f) {
    struct _stat64 st;
    return _fstat64(_fileno(f), &st) == 0 ? static_cast<int64_t>(st.st_size) : -1;
}

bool streamTruncate(std::FILE* f, int64_t length) {
    const auto handle = reinterpret_cast<HANDLE>(_get_osfhandle(_fileno(f)));
    if (handle == INVALID_HANDLE_VALUE) return false;
    LARGE_INTEGER zero{}, current{}, target{};
    target.QuadPart = length;
    if (!SetFilePointerEx(handle, zero, &current, FILE_CURRENT)) return false;
    const bool cut = SetFilePointerEx(handle, target, nullptr, FILE_BEGIN) && SetEndOfFile(handle);
    SetFilePointerEx(handle, current, nullptr, FILE_BEGIN);
    return cut;
}

// _commit calls FlushFileBuffers on the file's handle.
bool streamSync(std::FILE* f) { return std::fflush(f) == 0 && _commit(_fileno(f)) == 0; }

bool localNow(std::tm& out) {
    const __time64_t now = _time64(nullptr);
    return _localtime64_s(&out, &now) == 0;
}

std::string fullPath(const char* path) {
    std::vector<char> buffer(kPathChars);
    DWORD n = GetFullPathNameA(path, static_cast<DWORD>(buffer.size()), buffer.data(), nullptr);
    if (n >= buffer.size()) {  // longer than the shell's limit: n is the size needed
        buffer.resize(n + 1);
        n = GetFullPathNameA(path, static_cast<DWORD>(buffer.size()), buffer.data(), nullptr);
    }
    if (n == 0 || n >= buffer.size()) return path;
    return std::string(buffer.data(), n);
}

PathKind pathKind(const char* path) {
    const DWORD attributes = GetFileAttributesA(path);
    if (attributes == INVALID_FILE_ATTRIBUTES) return PathKind::Missing;
    return (attributes & FILE_ATTRIBUTE_DIRECTORY) != 0 ? PathKind::Directory : PathKind::File;
}

int32_t createFolderOf(const char* filePath) {
    try {
        // The shell takes '\' only, a folder without its file and a full path.
        std::vector<char> folder(std::strlen(filePath) + kPathChars, '\0');
        std::strcpy(folder.data(), filePath);
        for (char& c : folder)
            if (c == '/') c = '\\';
        PathRemoveFileSpecA(folder.data());
        std::string full(folder.data());
        if (PathIsRelativeA(folder.data())) {
            char cwd[kPathChars * 4];
            const DWORD n = GetCurrentDirectoryA(sizeof cwd, cwd);
            if (n != 0 && n < sizeof cwd) full = std::string(cwd) + "\\" + full;
        }
        const int rc = SHCreateDirectoryExA(nullptr, full.c_str(), nullptr);
        return (rc == ERROR_SUCCESS || rc == ERROR_FILE_EXISTS || rc == ERROR_ALREADY_EXISTS) ? 1 : 0;
    } catch (...) {
        return 0;
    }
}

const char* const kSharedLibrarySuffix = ".dll";

void* libraryLoad(const char* name) {
    QuietErrors quiet;
    return reinterpret_cast<void*>(LoadLibraryA(name));
}

AnyFunction librarySymbol(void* library, const char* name) {
    // Through the generic function type, which any function type converts to.
    return reinterpret_cast<AnyFunction>(GetProcAddress(static_cast<HMODULE>(library), name));
}

void libraryFree(void* library) { FreeLibrary(static_cast<HMODULE>(library)); }

int32_t sendCopyData(uintptr_t window, const char* text) {
    if (text == nullptr) return -1;
    COPYDATASTRUCT data;
    data.dwData = 1;
    data.cbData = static_cast<DWORD>(std::strlen(text));
    data.lpData = const_cast<char*>(text);
    return static_cast<int32_t>(
        SendMessageA(reinterpret_cast<HWND>(window), WM_COPYDATA, 0, reinterpret_cast<LPARAM>(&data)));
}

bool shortcutsResolve() { return true; }

int32_t resolveShortcut(const char* linkPath, char* target) {
    if (target != nullptr) target[0] = '\0';
    if (linkPath == nullptr || target == nullptr) return static_cast<int32_t>(E_POINTER);
    ComScope com;
    IShellLinkA* link = nullptr;
    HRESULT hr = CoCreateInstance(CLSID_ShellLink, nullptr, CLSCTX_INPROC_SERVER, IID_IShellLinkA,
                                  reinterpret_cast<void**>(&link));
    if (FAILED(hr)) return static_cast<int32_t>(hr);
    IPersistFile* file = nullptr;
    hr = link->QueryInterface(IID_IPersistFile, reinterpret_cast<void**>(&file));
    if (SUCCEEDED(hr)) {
        WCHAR wide[kPathChars] = {};
        MultiByteToWideChar(CP_ACP, 0, linkPath, -1, wide, kPathChars);
        hr = file->Load(wide, 0);
        // No user interface, update, no search, no tracking, no link information.
        if (SUCCEEDED(hr)) hr = link->Resolve(nullptr, 0x75);
        char path[kPathChars] = {};
        if (SUCCEEDED(hr)) {
            WIN32_FIND_DATAA data;
            hr = link->GetPath(path, kPathChars, &data, SLGP_RAWPATH);
        }
        if (SUCCEEDED(hr)) {
            char description[kPathChars] = {};
            hr = link->GetDescription(description, kPathChars);
        }
        if (SUCCEEDED(hr)) {
            std::strncpy(target, path, kPathChars - 1);
            target[kPathChars - 1] = '\0';
        }
        file->Release();
    }
    link->Release();
    return static_cast<int32_t>(hr);
}

}  // namespace platform
