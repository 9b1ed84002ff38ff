// `tova info FILE [--item ITEM] [--json]`: what a record file holds, like a
// header dump. The record-file part comes first; the part of the file's kind
// is added under its id ("grd", "xfs", "vre"). A gridded file whose data end
// elsewhere than its header says gets what `check` says of it after the
// header. --item shows one item of a gridded file in full.
#include <cstdio>
#include <string>
#include <vector>

#include "grd_commands.h"
#include "text.h"
#include "tova_cli.h"

namespace tova_cli {

int runInfo(const InfoOptions& options) {
    const RecordFileInfo file = probeRecordFile(options.file);
    if (options.item) {
        if (file.kind != FileKind::Grid) {
            throw Failure(options.file + " is no gridded data file (it is a " + kindDescription(file.kind) +
                          "): --item is for gridded files");
        }
        const Value item = describeItem(file, *options.item);
        printOut(options.json ? toJson(item) : toText(item));
        return kExitOk;
    }
    Value doc = describeRecordFile(file);
    Diagnosis diagnosis;
    // When the kind's own reader fails, the record-file part is still shown.
    std::string failure;
    try {
        switch (file.kind) {
        case FileKind::Grid: doc.add(kindId(file.kind), describeGrid(file, &diagnosis)); break;
        case FileKind::Xsec: doc.add(kindId(file.kind), describeXsec(file)); break;
        case FileKind::Vre: doc.add(kindId(file.kind), describeVre(file)); break;
        case FileKind::Unknown: break;
        }
    } catch (const Failure& e) {
        failure = e.what();
        doc.add(kindId(file.kind), Value::object()).add("error", failure);
        if (file.kind == FileKind::Grid) diagnosis = diagnose(options.file);
    }
    // A part may also say what it could not read after what it could.
    if (const Value* part = doc.find(kindId(file.kind)); part != nullptr && failure.empty()) {
        if (const Value* error = part->find("error"); error != nullptr && error->text() != nullptr) failure = *error->text();
    }
    // What check says: the damage with its notes, or the warnings.
    std::vector<std::string> said;
    for (const std::string& line : diagnosis.lines) {
        if (diagnosis.damaged ? line.rfind("OK: ", 0) != 0 : line.rfind("warning: ", 0) == 0) said.push_back(line);
    }
    if (!said.empty() && options.json) {
        Value& lines = doc.add("diagnosis", Value::array());
        for (const std::string& line : said) lines.push(line);
    }
    std::string text = options.json ? toJson(doc) : toText(doc);
    if (!options.json) {
        for (const std::string& line : said) text += line + "\n";
    }
    printOut(text);
    if (diagnosis.damaged) return kExitFailed;
    if (failure.empty()) return kExitOk;
    std::fprintf(stderr, "tova: %s\n", failure.c_str());
    return kExitFailed;
}

}  // namespace tova_cli
