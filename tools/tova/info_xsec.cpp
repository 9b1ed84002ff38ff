// The cross-section part of `tova info` (pending the cross-section API).
#include "tova_cli.h"

namespace tova_cli {

Value describeXsec(const RecordFileInfo&) { throw Failure("cross-section files: not available yet"); }

}  // namespace tova_cli
