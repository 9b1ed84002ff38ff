// Running another program from the tool (the platform layer for it): used by
// the commands that hand their work to the Python package (python_command.h).
#pragma once

#include <string>
#include <vector>

namespace tova_cli {

// Between the folders of a search path such as PYTHONPATH.
#ifdef _WIN32
constexpr char kPathListSeparator = ';';
#else
constexpr char kPathListSeparator = ':';
#endif

// Runs args[0] (looked up on the path when it holds no folder) with the
// other arguments, the tool's standard streams and extra variables added to
// its environment ("NAME=value"); waits for it. The program's exit status,
// or -1 with *error set when it could not be started or was killed.
int runProgram(const std::vector<std::string>& args, const std::vector<std::string>& environment, std::string* error);

}  // namespace tova_cli
