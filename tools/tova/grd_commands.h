// The gridded-data commands. `info`, `check`, `dump`, `stats` and `demo` reach
// everything gridded through the declarations below (info_grd.cpp, dump.cpp,
// stats.cpp, demo.cpp, check_grd.cpp); main.cpp parses their options.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "check.h"
#include "tova_cli.h"

namespace tova_cli {

// Time steps first..last, 0-based and inclusive; no last: to the end.
struct StepRange {
    int64_t first = 0;
    std::optional<int64_t> last;
};

enum class DumpFormat { Text, Csv };

struct DumpOptions {
    std::string file;
    std::optional<int32_t> item;        // 1-based item number; all items when absent
    std::optional<StepRange> steps;     // all time steps when absent
    std::optional<int32_t> staticItem;  // 1-based static item: dump it instead of time steps
    std::optional<int64_t> limit;       // values shown per item and time step
    DumpFormat format = DumpFormat::Text;
};
int runDump(const DumpOptions& options);

struct StatsOptions {
    std::string file;
    std::optional<int32_t> item;  // 1-based; all items when absent
    bool json = false;
};
int runStats(const StatsOptions& options);

struct DemoOptions {
    std::string out = "sample.grd";
};
int runDemo(const DemoOptions& options);

// The gridded-data part of `info` (added under "grd"): file type, titles,
// application, data type, delete values, projection, time axis, items, static
// items, custom blocks.
Value describeGrid(const RecordFileInfo& file);

// `repair`: the header of a file whose writer was killed brought up to date
// with the complete time steps on disk.
struct RepairOptions {
    std::string file;
    bool dryRun = false;  // report only, change nothing
};
int runRepair(const RepairOptions& options);

// Rules of gridded files for `check`, and a load through the data-file API.
std::unique_ptr<KindCheck> gridCheck(const RecordFileInfo& file);

}  // namespace tova_cli
