// Workspace helpers: folder creation for new files, notification of a host
// project window, and shell shortcuts. The system services behind them (the
// shell and COM on Windows; elsewhere folders only, no host window, and
// shortcuts that are ordinary files) live in the platform layer.
#include "tova/workspace.h"

#include <cctype>
#include <cstdlib>
#include <cstring>
#include <string>

#include "platform/platform.h"
#include "workspace/workspace_internal.h"

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
    return platform::createFolderOf(filePath);
}

int32_t TOVA_CALL TdProject_AddFile(const char* filePath) {
    uintptr_t window = 0;
    if (!tdParseProjectWindow(std::getenv("TDPROJECTXXXXX"), &window)) return -1;
    return platform::sendCopyData(window, filePath);
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
    return platform::resolveShortcut(linkPath, target);
}

}  // extern "C"
