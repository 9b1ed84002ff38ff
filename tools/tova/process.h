// Running another program from the tool (the platform layer for it): used by
// `convert`, which hands its work to the Python package.
#pragma once

#include <string>
#include <vector>

namespace tova_cli {

// Runs argv[0] (looked up on PATH when it holds no directory separator) with
// the arguments argv[1...], standard streams inherited, and waits for it.
// Returns its exit status, or -1 when it could not be started or did not
// exit normally.
int runProgram(const std::vector<std::string>& argv);

// Whether a file exists.
bool fileExists(const std::string& path);

// Puts dir in front of the path list in the environment variable name
// (for this process and the programs it starts).
void prependToPathVariable(const char* name, const std::string& dir);

}  // namespace tova_cli
