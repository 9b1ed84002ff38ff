// The commands that the tool hands over to the Python package (`python3 -m
// tova COMMAND ...`: convert, plot).
#pragma once

#include <string>
#include <vector>

namespace tova_cli {

// Runs `python3 -m tova command args...` and passes its exit status on. The
// interpreter is TOVA_PYTHON, else Debian's (which sees Debian's modules),
// else the first python3 on the path. Run from its build tree, the tool gives
// Python the package of the same checkout and, for a plain (not sanitizer)
// build, its libraries. When the package or one of modules cannot be
// imported, standard error says what is needed (needs: "the conversion needs
// ... with xarray, ...") and how to install it (Debian's packages), and the
// result is kExitFailed.
struct PythonNeeds {
    std::vector<std::string> modules;  // imported by the command besides tova
    std::string what;                  // "the conversion needs the Python package tova with ..."
    std::string debianPackages;        // "python3-xarray python3-netcdf4 ..."
};
int runPythonCommand(const std::string& command, const std::vector<std::string>& args, const PythonNeeds& needs);

}  // namespace tova_cli
