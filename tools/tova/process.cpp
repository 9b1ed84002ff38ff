// Running another program: POSIX spawn and wait, or the Windows runtime's
// spawn; the only place of the tool where the two differ for this.
#include "process.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>

#ifdef _WIN32
#include <process.h>
#else
#include <spawn.h>
#include <sys/wait.h>
extern char** environ;
#endif

namespace tova_cli {

int runProgram(const std::vector<std::string>& args, const std::vector<std::string>& environment, std::string* error) {
    if (args.empty()) {
        if (error != nullptr) *error = "no program";
        return -1;
    }
#ifdef _WIN32
    for (const std::string& entry : environment) {
        const size_t eq = entry.find('=');
        if (eq != std::string::npos) _putenv_s(entry.substr(0, eq).c_str(), entry.substr(eq + 1).c_str());
    }
    // The runtime joins the arguments with blanks: quote each one.
    std::vector<std::string> quoted;
    for (const std::string& a : args) {
        std::string q = "\"";
        for (char c : a) q += c == '"' ? std::string("\\\"") : std::string(1, c);
        quoted.push_back(q + "\"");
    }
    std::vector<const char*> argv;
    for (const std::string& a : quoted) argv.push_back(a.c_str());
    argv.push_back(nullptr);
    const intptr_t status = _spawnvp(_P_WAIT, args[0].c_str(), argv.data());
    if (status < 0) {
        if (error != nullptr) *error = std::strerror(errno);
        return -1;
    }
    return static_cast<int>(status);
#else
    // The tool's environment with the given variables in place of its own.
    std::vector<std::string> entries(environment);
    for (char** e = environ; *e != nullptr; ++e) {
        const char* eq = std::strchr(*e, '=');
        const size_t nameLength = eq != nullptr ? static_cast<size_t>(eq - *e) + 1 : std::strlen(*e);
        bool replaced = false;
        for (const std::string& entry : environment) {
            replaced = replaced || entry.compare(0, nameLength, *e, nameLength) == 0;
        }
        if (!replaced) entries.emplace_back(*e);
    }
    std::vector<char*> envp;
    for (std::string& entry : entries) envp.push_back(entry.data());
    envp.push_back(nullptr);
    std::vector<char*> argv;
    for (const std::string& a : args) argv.push_back(const_cast<char*>(a.c_str()));
    argv.push_back(nullptr);
    pid_t pid = 0;
    const int failed = posix_spawnp(&pid, argv[0], nullptr, nullptr, argv.data(), envp.data());
    if (failed != 0) {
        if (error != nullptr) *error = std::strerror(failed);
        return -1;
    }
    int status = 0;
    if (waitpid(pid, &status, 0) != pid || !WIFEXITED(status)) {
        if (error != nullptr) *error = "the program did not exit normally";
        return -1;
    }
    return WEXITSTATUS(status);
#endif
}

}  // namespace tova_cli
