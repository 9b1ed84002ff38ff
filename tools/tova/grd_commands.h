// The gridded-data commands. `info`, `check`, `dump`, `stats` and `demo` reach
// everything gridded through the declarations below (info_grd.cpp, dump.cpp,
// stats.cpp, demo.cpp, check_grd.cpp); main.cpp parses their options.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "check.h"
#include "selection.h"
#include "tova_cli.h"

namespace tova_cli {

enum class DumpFormat { Text, Csv };

struct DumpOptions {
    std::string file;
    Selection select;
    std::optional<std::string> staticItem;  // number or name: dump it instead of time steps
    std::optional<int64_t> limit;           // values shown per item and time step
    DumpFormat format = DumpFormat::Text;
};
int runDump(const DumpOptions& options);

struct StatsOptions {
    std::string file;
    Selection select;
    bool json = false;
};
int runStats(const StatsOptions& options);

// `plot`: drawn by the Python package (python3 -m tova plot); args are the
// command line after "plot".
int runPlot(const std::vector<std::string>& args);

// Says what `check` says of a damaged file on standard error, in place of
// failure (which is said when the check finds nothing wrong); returns
// kExitFailed.
int reportDamage(const std::string& path, const std::string& failure);

struct DemoOptions {
    std::string out = "sample.grd";
};
int runDemo(const DemoOptions& options);

// The gridded-data part of `info` (added under "grd"): file type, titles,
// application, data type, delete values, projection, time axis, items, static
// items, custom blocks.
// *diagnosis gets what `check` says when the data end elsewhere than the
// header's time steps do (it stays empty for a sound file).
Value describeGrid(const RecordFileInfo& file, Diagnosis* diagnosis);
// One item in full for `info --item`: quantity, unit, axis with its
// coordinates, the time steps and the statistics the file keeps.
Value describeItem(const RecordFileInfo& file, const std::string& key);

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
