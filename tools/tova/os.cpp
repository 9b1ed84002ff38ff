// The operating-system services of the tool (see os.h): POSIX and Windows.
#include "os.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#ifdef _WIN32
#include <io.h>
#include <process.h>
#include <windows.h>
#else
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>
extern char** environ;
#endif

namespace tova_cli {

bool isTerminal(Stream stream) {
    std::FILE* f = stream == Stream::Out ? stdout : stderr;
#ifdef _WIN32
    return _isatty(_fileno(f)) != 0;
#else
    return isatty(fileno(f)) != 0;
#endif
}

std::string programFolder() {
    std::error_code ec;
#ifdef _WIN32
    char buffer[MAX_PATH] = {};
    const DWORD n = GetModuleFileNameA(nullptr, buffer, MAX_PATH);
    if (n == 0 || n >= MAX_PATH) return {};
    return std::filesystem::path(buffer).parent_path().string();
#else
    const std::filesystem::path self = std::filesystem::read_symlink("/proc/self/exe", ec);
    return ec ? std::string() : self.parent_path().string();
#endif
}

int runProgram(const std::vector<std::string>& args, const std::vector<std::string>& environment, std::string* error) {
    if (args.empty()) {
        *error = "no program";
        return -1;
    }
    std::fflush(stdout);
    std::fflush(stderr);
#ifdef _WIN32
    for (const std::string& e : environment) _putenv(e.c_str());
    std::vector<const char*> argv;
    for (const std::string& a : args) argv.push_back(a.c_str());
    argv.push_back(nullptr);
    const intptr_t status = _spawnvp(_P_WAIT, argv[0], argv.data());
    if (status == -1) {
        *error = std::strerror(errno);
        return -1;
    }
    return static_cast<int>(status);
#else
    std::vector<std::string> strings(args);
    std::vector<char*> argv;
    for (std::string& a : strings) argv.push_back(a.data());
    argv.push_back(nullptr);
    // The tool's environment with the extra variables replacing their namesakes.
    std::vector<std::string> envStrings(environment);
    for (char** e = environ; *e != nullptr; ++e) {
        const char* equals = std::strchr(*e, '=');
        const size_t nameLength = equals != nullptr ? static_cast<size_t>(equals - *e) + 1 : std::strlen(*e);
        bool replaced = false;
        for (const std::string& extra : environment) replaced = replaced || extra.compare(0, nameLength, *e, nameLength) == 0;
        if (!replaced) envStrings.emplace_back(*e);
    }
    std::vector<char*> envp;
    for (std::string& e : envStrings) envp.push_back(e.data());
    envp.push_back(nullptr);
    pid_t pid = 0;
    const int started = posix_spawnp(&pid, argv[0], nullptr, nullptr, argv.data(), envp.data());
    if (started != 0) {
        *error = std::strerror(started);
        return -1;
    }
    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR) {
            *error = std::strerror(errno);
            return -1;
        }
    }
    if (WIFEXITED(status)) return WEXITSTATUS(status);
    *error = "ended by signal " + std::to_string(WTERMSIG(status));
    return -1;
#endif
}

}  // namespace tova_cli
