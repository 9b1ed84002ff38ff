// Stand-in for the gridded-data parts of the tool (see grd_commands.h): the
// library this tool is built against cannot yet read the header and data of
// gridded files, so these parts say so plainly instead of guessing.
#include <cstdio>

#include "grd_commands.h"

namespace tova_cli {

namespace {

constexpr const char* kPending =
    "not available yet: reading gridded data files needs the library's gridded data-file layer";

int notAvailable(const char* command) {
    std::fprintf(stderr, "tova %s: %s\n", command, kPending);
    return kExitFailed;
}

class PendingGridCheck final : public KindCheck {
public:
    std::optional<Problem> finish() override {
        notes_.push_back(std::string("gridded header and data: ") + kPending);
        return std::nullopt;
    }
};

}  // namespace

int runDump(const DumpOptions&) { return notAvailable("dump"); }
int runStats(const StatsOptions&) { return notAvailable("stats"); }
int runDemo(const DemoOptions&) { return notAvailable("demo"); }

Value describeGrid(const RecordFileInfo&) {
    Value grd = Value::object();
    grd.add("details", kPending);
    return grd;
}

std::unique_ptr<KindCheck> gridCheck(const RecordFileInfo&) { return std::make_unique<PendingGridCheck>(); }

}  // namespace tova_cli
