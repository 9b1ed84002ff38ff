// `tova info FILE [--json]`: what a record file holds, like a header dump. The
// record-file part comes first; the part of the file's kind is added under
// its id ("grd", "xfs", "vre").
#include <cstdio>

#include "grd_commands.h"
#include "text.h"
#include "tova_cli.h"

namespace tova_cli {

int runInfo(const InfoOptions& options) {
    const RecordFileInfo file = probeRecordFile(options.file);
    Value doc = describeRecordFile(file);
    // When the kind's own reader fails, the record-file part is still shown.
    std::string failure;
    try {
        switch (file.kind) {
        case FileKind::Grid: doc.add(kindId(file.kind), describeGrid(file)); break;
        case FileKind::Xsec: doc.add(kindId(file.kind), describeXsec(file)); break;
        case FileKind::Vre: doc.add(kindId(file.kind), describeVre(file)); break;
        case FileKind::Unknown: break;
        }
    } catch (const Failure& e) {
        failure = e.what();
        doc.add(kindId(file.kind), Value::object()).add("error", failure);
    }
    // A part may also say what it could not read after what it could.
    if (const Value* part = doc.find(kindId(file.kind)); part != nullptr && failure.empty()) {
        if (const Value* error = part->find("error"); error != nullptr && error->text() != nullptr) failure = *error->text();
    }
    printOut(options.json ? toJson(doc) : toText(doc));
    if (failure.empty()) return kExitOk;
    std::fprintf(stderr, "tova: %s\n", failure.c_str());
    return kExitFailed;
}

}  // namespace tova_cli
