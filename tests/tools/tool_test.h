// Helpers of the tool tests: running the built `tova` program with its output
// captured, telling a clean exit from a crash or a sanitizer report, and
// making small record files of every kind through the C API.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "common/testutil.h"

namespace tooltest {

struct Run {
    int exitCode = -1;  // the status passed to exit(), -1 when killed by a signal
    int signal = 0;     // the signal that ended the program, 0 if none
    std::string out;    // standard output
    std::string err;    // standard error

    // Ended by exit() with 0, 1 or 2 and without a sanitizer report.
    bool clean() const;
};

// Runs the tool with args; sanitizer reports get exit codes of their own.
Run runTova(const std::vector<std::string>& args);

// Output with the stamps ("YYYY-MM-DD hh:mm:ss") and every occurrence of
// path ("FILE") masked, for golden texts.
std::string masked(std::string text, const std::string& path);

// Offsets of the structure of a sound record file, from a walk through the
// public API: the byte ranges of every record header, block start and
// terminator, and the offsets at which a top-level record or block ends (a
// file cut there is still well formed).
struct Layout {
    uint32_t rcfBase = 0;
    uint32_t appBase = 0;
    std::vector<std::pair<int64_t, int64_t>> headers;  // [begin, end) of each record header and block mark
    std::vector<int64_t> boundaries;
    uint64_t records = 0;
    uint64_t blocks = 0;
};
Layout walkLayout(const std::string& path);

// A VRE file with two bodies and every item filled (size parameter 6 = 1).
// The first body's name is given.
void writeVreFile(const std::string& path, const std::string& firstBodyName = "hull");

// A cross-section file of three cross sections, written out of key order:
// ("River A", 250, "left") with 2 processed rows and 2 coordinates, ("Canal",
// 0, "") with no data, ("River A", 100.5, "left", extra "survey 2019") with
// 3 raw points and 2 selection values.
void writeXsecFile(const std::string& path);

// A gridded data file written through the library: file type 1 with an
// equidistant calendar axis (2024-03-21 06:00:00, steps of 1800 s), a
// projection, a custom block "run" (three integers), statistics type 2, two
// static items ("depth", a 4 x 3 float grid with values 1.5 + element, and
// "flags", five integers 10 + element) and two items ("level", WaterLevel
// in m, a 4 x 3 float grid, and "flux", VelocityX in m/s, five doubles on a
// non-equidistant axis) over `steps` time steps holding gridValue().
void writeGridFile(const std::string& path, int32_t steps = 3);
// Value of element e (0-based) of item n (1-based) at time step t; elements
// 0 and 5 of "level" are the float delete value.
double gridValue(int32_t t, int32_t n, int32_t e);

// Replaces the bytes of a file from offset on.
void patchBytes(const std::string& path, uint64_t offset, const std::vector<uint8_t>& bytes);

}  // namespace tooltest
