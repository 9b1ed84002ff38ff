// Running another program and adjusting the environment: POSIX spawn and
// wait, or the Windows runtime's spawn; the only platform-specific code of
// the tool besides the terminal test of the progress line.
#include "process.h"

#include <cstdlib>
#include <sys/stat.h>

#ifdef _WIN32
#include <process.h>
#else
#include <spawn.h>
#include <sys/wait.h>
extern char** environ;
#endif

namespace tova_cli {

namespace {
#ifdef _WIN32
constexpr char kListSeparator = ';';
#else
constexpr char kListSeparator = ':';
#endif
}  // namespace

int runProgram(const std::vector<std::string>& argv) {
    if (argv.empty()) return -1;
#ifdef _WIN32
    // The runtime joins the arguments with blanks: quote each one.
    std::vector<std::string> quoted;
    for (const std::string& a : argv) {
        std::string q = "\"";
        for (char c : a) q += c == '"' ? std::string("\\\"") : std::string(1, c);
        quoted.push_back(q + "\"");
    }
    std::vector<const char*> args;
    for (const std::string& a : quoted) args.push_back(a.c_str());
    args.push_back(nullptr);
    const intptr_t status = _spawnvp(_P_WAIT, argv[0].c_str(), args.data());
    return status < 0 ? -1 : static_cast<int>(status);
#else
    std::vector<char*> args;
    for (const std::string& a : argv) args.push_back(const_cast<char*>(a.c_str()));
    args.push_back(nullptr);
    pid_t pid = 0;
    if (posix_spawnp(&pid, args[0], nullptr, nullptr, args.data(), environ) != 0) return -1;
    int status = 0;
    if (waitpid(pid, &status, 0) != pid || !WIFEXITED(status)) return -1;
    return WEXITSTATUS(status);
#endif
}

bool fileExists(const std::string& path) {
    struct stat info {};
    return stat(path.c_str(), &info) == 0;
}

void prependToPathVariable(const char* name, const std::string& dir) {
    const char* old = std::getenv(name);
    std::string value = dir;
    if (old != nullptr && *old != '\0') value += kListSeparator + std::string(old);
#ifdef _WIN32
    _putenv_s(name, value.c_str());
#else
    setenv(name, value.c_str(), 1);
#endif
}

}  // namespace tova_cli
