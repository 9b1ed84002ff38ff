// `tova info FILE [--json]`: what a record file holds, like a header dump. The
// record-file part comes first; the part of the file's kind is added under
// its id ("grd", "xfs", "vre").
#include "grd_commands.h"
#include "text.h"
#include "tova_cli.h"

namespace tova_cli {

int runInfo(const InfoOptions& options) {
    const RecordFileInfo file = probeRecordFile(options.file);
    Value doc = describeRecordFile(file);
    switch (file.kind) {
    case FileKind::Grid: doc.add(kindId(file.kind), describeGrid(file)); break;
    case FileKind::Xsec: doc.add(kindId(file.kind), describeXsec(file)); break;
    case FileKind::Vre: doc.add(kindId(file.kind), describeVre(file)); break;
    case FileKind::Unknown: break;
    }
    printOut(options.json ? toJson(doc) : toText(doc));
    return kExitOk;
}

}  // namespace tova_cli
