// The few services of the operating system the tool needs beyond the
// standard library, behind one interface: whether a standard stream is a
// terminal and where the tool's own program lies (running another program
// is process.h's).
#pragma once

#include <string>

namespace tova_cli {

enum class Stream { Out, Err };

// Whether standard output or standard error is a terminal.
bool isTerminal(Stream stream);

// The folder of the running program ("" when the system does not say).
std::string programFolder();

}  // namespace tova_cli
