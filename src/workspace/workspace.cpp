// Workspace helpers: folder creation for new files, notification of a host
// project window, and shell shortcuts. On Windows these use the shell and
// COM; elsewhere folders are made with std::filesystem ('/' separates
// components, a backslash is an ordinary character), no host window exists,
// and shortcuts are ordinary files that cannot be resolved.
#include "tova/workspace.h"

#include <cctype>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <system_error>

#include "workspace/workspace_internal.h"

#ifdef _WIN32
#include <windows.h>
#include <shlobj.h>
#include <shlwapi.h>
#endif

namespace {
constexpr int32_t kNotImplemented = static_cast<int32_t>(0x80004001u);
}

bool tdParseProjectWindow(const char* value, uintptr_t* window) {
    if (value == nullptr) return false;
    // Four tokens separated by '&' (empty tokens are skipped, as a tokenizer
    // would); only the fourth is used.
    std::string tokens[4];
    int found = 0;
    const char* p = value;
    while (*p != '\0' && found < 4) {
        while (*p == '&') ++p;
        if (*p == '\0') break;
        const char* start = p;
        while (*p != '\0' && *p != '&') ++p;
        tokens[found++].assign(start, p);
    }
    if (found < 4) return false;
    unsigned long long handle = 0;
    char* end = nullptr;
    const std::string& hex = tokens[3];
    // "%x" semantics: optional blanks, optional 0x prefix, then hex digits.
    handle = std::strtoull(hex.c_str(), &end, 16);
    if (end == hex.c_str() || handle == 0) return false;
    *window = static_cast<uintptr_t>(handle);
    return true;
}

extern "C" {

int32_t TOVA_CALL TdCreateFolder(const char* filePath) {
    if (filePath == nullptr) return 0;
    try {
#ifdef _WIN32
        std::string path(filePath);
        for (char& c : path)
            if (c == '/') c = '\\';
        char folder[MAX_PATH * 4] = {};
        std::strncpy(folder, path.c_str(), sizeof folder - 1);
        PathRemoveFileSpecA(folder);
        std::string full(folder);
        if (PathIsRelativeA(folder)) {
            char cwd[MAX_PATH * 4];
            if (GetCurrentDirectoryA(sizeof cwd, cwd) != 0) full = std::string(cwd) + "\\" + folder;
        }
        const int rc = SHCreateDirectoryExA(nullptr, full.c_str(), nullptr);
        return (rc == ERROR_SUCCESS || rc == ERROR_FILE_EXISTS || rc == ERROR_ALREADY_EXISTS) ? 1 : 0;
#else
        const std::filesystem::path folder = std::filesystem::absolute(filePath).parent_path();
        std::error_code ec;
        std::filesystem::create_directories(folder, ec);
        if (ec) return 0;
        return std::filesystem::is_directory(folder, ec) ? 1 : 0;
#endif
    } catch (...) {
        return 0;
    }
}

int32_t TOVA_CALL TdProject_AddFile(const char* filePath) {
    uintptr_t window = 0;
    if (!tdParseProjectWindow(std::getenv("TDPROJECTXXXXX"), &window)) return -1;
#ifdef _WIN32
    if (filePath == nullptr) return -1;
    COPYDATASTRUCT data;
    data.dwData = 1;
    data.cbData = static_cast<DWORD>(std::strlen(filePath));
    data.lpData = const_cast<char*>(filePath);
    return static_cast<int32_t>(
        SendMessageA(reinterpret_cast<HWND>(window), WM_COPYDATA, 0, reinterpret_cast<LPARAM>(&data)));
#else
    (void)filePath;
    return -1;  // no host project window outside Windows
#endif
}

int32_t TOVA_CALL TdShortCut_IsShortcut(const char* path) {
    if (path == nullptr) return 0;
    const size_t n = std::strlen(path);
    if (n < 4) return 0;
    const char* ext = path + n - 4;
    return (ext[0] == '.' && std::tolower(static_cast<unsigned char>(ext[1])) == 'l' &&
            std::tolower(static_cast<unsigned char>(ext[2])) == 'n' &&
            std::tolower(static_cast<unsigned char>(ext[3])) == 'k')
               ? 1
               : 0;
}

int32_t TOVA_CALL TdShortCut_ResolveShortcut(const char* linkPath, char* target) {
    if (target != nullptr) target[0] = '\0';
#ifdef _WIN32
    if (linkPath == nullptr || target == nullptr) return static_cast<int32_t>(E_POINTER);
    IShellLinkA* link = nullptr;
    HRESULT hr = CoCreateInstance(CLSID_ShellLink, nullptr, CLSCTX_INPROC_SERVER, IID_IShellLinkA,
                                  reinterpret_cast<void**>(&link));
    if (FAILED(hr)) return static_cast<int32_t>(hr);
    IPersistFile* file = nullptr;
    hr = link->QueryInterface(IID_IPersistFile, reinterpret_cast<void**>(&file));
    if (SUCCEEDED(hr)) {
        WCHAR wide[MAX_PATH];
        MultiByteToWideChar(CP_ACP, 0, linkPath, -1, wide, MAX_PATH);
        hr = file->Load(wide, 0);
        if (SUCCEEDED(hr)) hr = link->Resolve(nullptr, 0x75);
        if (SUCCEEDED(hr)) {
            char path[MAX_PATH];
            WIN32_FIND_DATAA data;
            hr = link->GetPath(path, MAX_PATH, &data, SLGP_RAWPATH);
            if (SUCCEEDED(hr)) {
                char description[MAX_PATH];
                hr = link->GetDescription(description, MAX_PATH);
                if (SUCCEEDED(hr)) {
                    std::strncpy(target, path, MAX_PATH - 1);
                    target[MAX_PATH - 1] = '\0';
                }
            }
        }
        file->Release();
    }
    link->Release();
    return static_cast<int32_t>(hr);
#else
    (void)linkPath;
    return kNotImplemented;
#endif
}

}  // extern "C"
