// `tova plot FILE --item ITEM --time WHEN [-o out.png]`: a picture of one item
// at one time step, drawn by the Python package with matplotlib (`python3 -m
// tova plot`, which takes the same selection as dump). The tool hands its
// arguments over untouched; run from its build tree it points Python at the
// package and the libraries of the same checkout.
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include "grd_commands.h"
#include "os.h"

namespace tova_cli {

namespace {

std::string interpreter() {
    if (const char* chosen = std::getenv("TOVA_PYTHON"); chosen != nullptr && *chosen != '\0') return chosen;
    // Debian's interpreter sees Debian's numpy and matplotlib; another
    // python3 first on the path may not.
    std::error_code ec;
    if (std::filesystem::exists("/usr/bin/python3", ec)) return "/usr/bin/python3";
    return "python3";
}

[[maybe_unused]] bool sameFolder(const std::string& a, const std::string& b) {
    std::error_code ec;
    return !a.empty() && std::filesystem::equivalent(a, b, ec);
}

}  // namespace

int runPlot(const std::vector<std::string>& args) {
    std::vector<std::string> command{interpreter(), "-m", "tova", "plot"};
    command.insert(command.end(), args.begin(), args.end());
    std::vector<std::string> environment;
#if defined(TOVA_CLI_BUILD_DIR) && defined(TOVA_CLI_PYTHON_DIR)
    if (sameFolder(programFolder(), TOVA_CLI_BUILD_DIR)) {
        const char* path = std::getenv("PYTHONPATH");
        environment.push_back(std::string("PYTHONPATH=") + TOVA_CLI_PYTHON_DIR +
                              (path != nullptr && *path != '\0' ? std::string(1, kPathListSeparator) + path : ""));
#ifdef TOVA_CLI_LIBRARY_DIR
        if (std::getenv("TOVA_LIBRARY_DIR") == nullptr) {
            environment.push_back(std::string("TOVA_LIBRARY_DIR=") + TOVA_CLI_LIBRARY_DIR);
        }
#endif
    }
#endif
    std::string error;
    const int status = runProgram(command, environment, &error);
    if (status < 0) {
        throw Failure("plot runs " + command[0] + " -m tova plot (Python 3 with the tova package and matplotlib): " +
                      error);
    }
    return status;
}

}  // namespace tova_cli
