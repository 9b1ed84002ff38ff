// Shared declarations of the tova tool: exit codes, the failure type that
// commands throw, what the record-file header of a file says (kind detection)
// and the entry points of the subcommands wired up in main.cpp.
#pragma once

#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "json.h"

namespace tova_cli {

enum ExitCode : int {
    kExitOk = 0,
    kExitFailed = 1,  // the file is damaged or the command could not do its work
    kExitUsage = 2    // bad command line
};

// A command that cannot do its work: main prints "tova: <what>" on standard
// error and exits with kExitFailed.
class Failure : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// The kind of a record file, by its application tag.
enum class FileKind { Grid, Xsec, Vre, Unknown };

// "grd", "xfs", "vre", "unknown".
const char* kindId(FileKind kind);
// "gridded data file" and the like.
const char* kindDescription(FileKind kind);

// The status code with its meaning, e.g. "2014 (not a record file)".
std::string statusText(int32_t code);

// What the fixed header of a record file says.
struct RecordFileInfo {
    std::string path;      // as given on the command line
    std::string fullPath;  // as the library resolved it
    uint64_t size = 0;
    bool swapped = false;  // written in the byte order opposite to this machine's
    char appTag[4] = {};   // application tag bytes as stored
    FileKind kind = FileKind::Unknown;
    uint32_t versionCreate = 0;
    uint32_t versionEdit = 0;
    uint32_t versionCreateApp = 0;
    uint32_t versionEditApp = 0;
    std::string created;  // "YYYY-MM-DD hh:mm:ss"
    std::string edited;
    uint32_t rcfBase = 0;
    uint32_t appBase = 0;
};

// Opens path as a record file of any application and reads its header.
// *status gets the open status (0 on success); the result is meaningful only
// then.
RecordFileInfo probeRecordFile(const std::string& path, int32_t* status);
// The same, throwing Failure with a readable message when the file cannot be
// opened as a record file.
RecordFileInfo probeRecordFile(const std::string& path);

// The record-file part of `info`: kind, tag, versions, stamps, bases.
Value describeRecordFile(const RecordFileInfo& file);

// The whole tool: parses the command line (argv[0] is the program name),
// runs the subcommand and returns the exit code. Failures of a command are
// printed on standard error; no exception leaves it.
int run(int argc, char** argv);

// Subcommands (main.cpp wires their options). Each returns the exit code.
struct InfoOptions {
    std::string file;
    std::optional<std::string> item;  // one item in full, by number or name
    bool json = false;
};
int runInfo(const InfoOptions& options);

struct CheckOptions {
    std::string file;
};
int runCheck(const CheckOptions& options);

struct UnitsOptions {
    std::optional<std::string> query;
    bool json = false;
};
int runUnits(const UnitsOptions& options);

// `convert`: runs the Python package's converter with these arguments.
int runConvert(const std::vector<std::string>& args);

// Kind-specific parts of `info`. Each returns the member to add under the
// kind's id; Failure when the library cannot read the file.
Value describeVre(const RecordFileInfo& file);
Value describeXsec(const RecordFileInfo& file);

// Writes text to standard output in one go; Failure when that fails.
void printOut(const std::string& text);

}  // namespace tova_cli
