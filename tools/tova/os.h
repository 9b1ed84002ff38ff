// The few services of the operating system the tool needs beyond the
// standard library, behind one interface: whether a standard stream is a
// terminal, where the tool's own program lies, and running another program
// (the Python package's commands) with the tool's streams.
#pragma once

#include <string>
#include <vector>

namespace tova_cli {

enum class Stream { Out, Err };

// Between the folders of a search path such as PYTHONPATH.
#ifdef _WIN32
constexpr char kPathListSeparator = ';';
#else
constexpr char kPathListSeparator = ':';
#endif

// Whether standard output or standard error is a terminal.
bool isTerminal(Stream stream);

// The folder of the running program ("" when the system does not say).
std::string programFolder();

// Runs args[0] (looked up on the path when it holds no folder) with the
// other arguments, the tool's standard streams and extra variables added to
// its environment ("NAME=value"); waits for it. The program's exit status,
// or -1 with *error set when it could not be started or was killed.
int runProgram(const std::vector<std::string>& args, const std::vector<std::string>& environment, std::string* error);

}  // namespace tova_cli
