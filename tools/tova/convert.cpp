// `tova convert IN OUT [...]`: netCDF (CF) files to gridded data files and
// back. The conversion is the Python package's (`python3 -m tova convert`,
// on xarray, netCDF4, pyproj and UDUNITS-2); this command finds an
// interpreter that has the package, runs it with the same arguments and
// passes its exit status on, or says how to install what is missing. Run
// from its build tree it points Python at the package of the same checkout.
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "process.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

// The interpreter: TOVA_PYTHON, else Debian's (which sees Debian's modules),
// else the first python3 on the path.
std::string interpreter() {
    if (const char* chosen = std::getenv("TOVA_PYTHON"); chosen != nullptr && *chosen != '\0') return chosen;
    std::error_code ec;
    if (std::filesystem::exists("/usr/bin/python3", ec)) return "/usr/bin/python3";
    return "python3";
}

// Exit status of the probe when the package or xarray cannot be found.
constexpr int kMissing = 3;

const char* const kInstallHint =
    "tova convert: the conversion needs the Python package tova with xarray, netCDF4, pyproj and UDUNITS-2.\n"
    "  On Debian: apt-get install python3-xarray python3-netcdf4 python3-pyproj python3-cftime libudunits2-0\n"
    "  then install the package: pip install <source>/python (or put <source>/python on PYTHONPATH),\n"
    "  or set TOVA_PYTHON to an interpreter that has them.\n";

}  // namespace

int runConvert(const std::vector<std::string>& args) {
    std::vector<std::string> environment;
#ifdef TOVA_PYTHON_SOURCE_DIR
    std::error_code ec;
    if (std::filesystem::exists(TOVA_PYTHON_SOURCE_DIR "/tova/__init__.py", ec)) {
        const char* path = std::getenv("PYTHONPATH");
        environment.push_back(std::string("PYTHONPATH=") + TOVA_PYTHON_SOURCE_DIR +
                              (path != nullptr && *path != '\0' ? std::string(1, kPathListSeparator) + path : ""));
    }
#endif
    const std::string python = interpreter();
    std::string error;
    const int probe = runProgram({python, "-c",
                                  "import importlib.util as u, sys; "
                                  "sys.exit(0 if u.find_spec('tova') and u.find_spec('xarray') else 3)"},
                                 environment, &error);
    if (probe != 0) {
        if (probe != kMissing) std::fprintf(stderr, "tova convert: cannot run %s: %s\n", python.c_str(), error.c_str());
        std::fputs(kInstallHint, stderr);
        return kExitFailed;
    }
    std::vector<std::string> command = {python, "-m", "tova", "convert"};
    command.insert(command.end(), args.begin(), args.end());
    const int status = runProgram(command, environment, &error);
    if (status < 0) throw Failure("convert runs " + python + " -m tova convert: " + error);
    return status;
}

}  // namespace tova_cli
