// Workspace helpers, internal: parsing of the host-project variable, shared by
// the Windows sender and the tests.
#pragma once

#include <cstdint>

// Parses a "TDPROJECTXXXXX" value: four "&"-separated tokens, the fourth a
// non-zero window handle in hexadecimal. Returns true and the handle, or false.
bool tdParseProjectWindow(const char* value, uintptr_t* window);
