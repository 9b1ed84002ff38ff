// `tova repair FILE [--dry-run]`: brings the header of a gridded data file
// whose writer was killed up to date with the time steps it holds. The
// library counts the complete time steps (grdFileScan) and rewrites the
// header's count and time span in place (grdFileRecover); an unfinished time
// step after them stays on disk, uncounted, and is cut off by the next
// append. The file goes through the full check first, so that repair and
// check say the same of it: damage that repair cannot mend (anything but
// missing or uncounted time steps) is reported as check reports it. Exit
// status 0 when the file is consistent afterwards (or would be, with
// --dry-run), 1 when it cannot be repaired.
#include <string>

#include "grd_commands.h"
#include "tova/grd.h"

namespace tova_cli {

namespace {

std::string steps(int64_t n) { return std::to_string(n) + (n == 1 ? " time step" : " time steps"); }

}  // namespace

int runRepair(const RepairOptions& options) {
    const RecordFileInfo info = probeRecordFile(options.file);
    if (info.kind != FileKind::Grid) {
        printOut(options.file + ": not a gridded data file: only those can be repaired\n");
        return kExitFailed;
    }
    const Diagnosis diagnosis = diagnose(options.file);
    if (diagnosis.damaged && !diagnosis.repairable) {
        const std::string& line = diagnosis.lines.front();
        const std::string prefix = options.file + ": ";
        printOut(prefix + "cannot be repaired: " + (line.rfind(prefix, 0) == 0 ? line.substr(prefix.size()) : line) + "\n");
        return kExitFailed;
    }
    int32_t found = 0;
    int32_t inHeader = 0;
    int64_t tail = 0;
    int32_t status = grdFileScan(options.file.c_str(), &found, &inHeader, &tail);
    if (status != F_NO_ERROR) {
        printOut(options.file + ": cannot be repaired: " + statusText(status) + "\n");
        return kExitFailed;
    }
    std::string text = options.file + ": header says " + steps(inHeader) + ", file holds " +
                       std::to_string(found) + " complete " + (found == 1 ? "step" : "steps");
    if (tail > 0) text += " and a partial one (" + std::to_string(tail) + " bytes, ignored by readers)";
    if (options.dryRun) {
        printOut(text + (found == inHeader ? "; nothing to repair\n" : "; would repair\n"));
        return kExitOk;
    }
    status = grdFileRecover(options.file.c_str(), &found, &inHeader);
    if (status != F_NO_ERROR) {
        printOut(text + "; repair failed: " + statusText(status) + "\n");
        return kExitFailed;
    }
    printOut(text + (found == inHeader ? "; nothing to repair\n" : "; repaired\n"));
    return kExitOk;
}

}  // namespace tova_cli
