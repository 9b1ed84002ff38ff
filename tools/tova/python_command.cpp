// The Python-backed commands (see python_command.h): finding the interpreter
// and the package, probing for the modules a command needs, running it.
#include "python_command.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "os.h"
#include "process.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

std::string interpreter() {
    if (const char* chosen = std::getenv("TOVA_PYTHON"); chosen != nullptr && *chosen != '\0') return chosen;
    std::error_code ec;
    if (std::filesystem::exists("/usr/bin/python3", ec)) return "/usr/bin/python3";
    return "python3";
}

// Exit status of the probe when a module cannot be found.
constexpr int kMissing = 3;

// The variables that point Python at this checkout's package and libraries.
std::vector<std::string> checkoutEnvironment() {
    std::vector<std::string> environment;
#ifdef TOVA_PYTHON_SOURCE_DIR
    std::error_code ec;
    if (std::filesystem::exists(TOVA_PYTHON_SOURCE_DIR "/tova/__init__.py", ec)) {
        const char* path = std::getenv("PYTHONPATH");
        environment.push_back(std::string("PYTHONPATH=") + TOVA_PYTHON_SOURCE_DIR +
                              (path != nullptr && *path != '\0' ? std::string(1, kPathListSeparator) + path : ""));
    }
#endif
#if defined(TOVA_CLI_BUILD_DIR) && defined(TOVA_CLI_LIBRARY_DIR)
    const std::string folder = programFolder();
    std::error_code same;
    if (!folder.empty() && std::filesystem::equivalent(folder, TOVA_CLI_BUILD_DIR, same) &&
        std::getenv("TOVA_LIBRARY_DIR") == nullptr) {
        environment.push_back(std::string("TOVA_LIBRARY_DIR=") + TOVA_CLI_LIBRARY_DIR);
    }
#endif
    return environment;
}

}  // namespace

int runPythonCommand(const std::string& command, const std::vector<std::string>& args, const PythonNeeds& needs) {
    const std::vector<std::string> environment = checkoutEnvironment();
    const std::string python = interpreter();
    std::string names = "'tova'";
    for (const std::string& m : needs.modules) names += ", '" + m + "'";
    std::string error;
    const int probe = runProgram({python, "-c",
                                  "import importlib.util as u, sys; sys.exit(0 if all(u.find_spec(m) for m in (" +
                                      names + ")) else " + std::to_string(kMissing) + ")"},
                                 environment, &error);
    if (probe != 0) {
        if (probe != kMissing) {
            std::fprintf(stderr, "tova %s: cannot run %s: %s\n", command.c_str(), python.c_str(), error.c_str());
        }
        const std::string hint = "tova " + command + ": " + needs.what + ".\n  On Debian: apt-get install " +
                                 needs.debianPackages +
                                 "\n  then install the package: pip install <source>/python (or put <source>/python on "
                                 "PYTHONPATH),\n  or set TOVA_PYTHON to an interpreter that has them.\n";
        std::fputs(hint.c_str(), stderr);
        return kExitFailed;
    }
    std::vector<std::string> line = {python, "-m", "tova", command};
    line.insert(line.end(), args.begin(), args.end());
    const int status = runProgram(line, environment, &error);
    if (status < 0) throw Failure(command + " runs " + python + " -m tova " + command + ": " + error);
    return status;
}

}  // namespace tova_cli
