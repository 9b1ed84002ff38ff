// Kind detection: opens any record file through the library with a callback
// that accepts every application, reads what its fixed header says (tag,
// versions, stamps, bases) and tells gridded, cross-section and VRE files
// apart by the application tag stored in bytes 4-7.
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>

#include "handles.h"
#include "tova/rcf.h"
#include "tova/status.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

uint32_t acceptAnyApplication(uint32_t* version) {
    *version = 0;
    return RCF_ACCEPT_ANY_APP;
}

}  // namespace

RcfFilePtr openRecordFile(const std::string& path, int32_t* status) {
    FileHandle opened = nullptr;
    *status = rcfFileOpenRead(path.c_str(), &opened, acceptAnyApplication, nullptr);
    return RcfFilePtr(opened);
}

const char* kindId(FileKind kind) {
    switch (kind) {
    case FileKind::Grid: return "grd";
    case FileKind::Xsec: return "xfs";
    case FileKind::Vre: return "vre";
    case FileKind::Unknown: break;
    }
    return "unknown";
}

std::string statusText(int32_t code) {
    // The library's text is "NAME: meaning"; the meaning is enough here.
    const std::string text = grdGetStatusText(code);
    const size_t colon = text.find(": ");
    if (colon == std::string::npos) return std::to_string(code);
    return std::to_string(code) + " (" + text.substr(colon + 2) + ")";
}

RecordFileInfo probeRecordFile(const std::string& path, int32_t* status) {
    RecordFileInfo info;
    info.path = path;
    std::error_code ec;
    info.size = std::filesystem::file_size(path, ec);
    if (ec) info.size = 0;

    const RcfFilePtr file = openRecordFile(path, status);
    if (*status != F_NO_ERROR) return info;

    // The tag and application tag bytes as stored: the order they come in
    // shows the writer's byte order, and the application tag is four
    // characters in either order.
    char head[8] = {};
    std::ifstream raw(path, std::ios::binary);
    raw.read(head, sizeof(head));
    info.swapped = std::memcmp(head, "QTA_", 4) != 0;
    std::memcpy(info.appTag, head + 4, 4);
    if (std::memcmp(info.appTag, "GRD_", 4) == 0) {
        info.kind = FileKind::Grid;
    } else if (std::memcmp(info.appTag, "XFS_", 4) == 0) {
        info.kind = FileKind::Xsec;
    } else if (std::memcmp(info.appTag, "VRE_", 4) == 0) {
        info.kind = FileKind::Vre;
    }

    info.fullPath = rcfGetFilename(file.get());
    info.versionCreate = rcfGetVersionCreate(file.get());
    info.versionEdit = rcfGetVersionEdit(file.get());
    info.versionCreateApp = rcfGetVersionCreateApp(file.get());
    info.versionEditApp = rcfGetVersionEditApp(file.get());
    info.created = std::string(rcfGetFileCreationDate(file.get())) + " " + rcfGetFileCreationTime(file.get());
    info.edited = std::string(rcfGetFileEditDate(file.get())) + " " + rcfGetFileEditTime(file.get());
    info.rcfBase = rcfGetRCFbase(file.get());
    info.appBase = rcfGetAppBase(file.get());
    return info;
}

RecordFileInfo probeRecordFile(const std::string& path) {
    int32_t status = 0;
    RecordFileInfo info = probeRecordFile(path, &status);
    if (status == F_NO_ERROR) return info;
    std::error_code ec;
    if (std::filesystem::is_directory(path, ec)) throw Failure("cannot open " + path + ": it is a folder");
    if (status == F_ERR_OPEN) {
        // The library says only that the open failed; ask the system why.
        std::string reason = "the file cannot be opened";
        if (std::FILE* f = std::fopen(path.c_str(), "rb")) {
            std::fclose(f);
        } else {
            reason = std::strerror(errno);
        }
        throw Failure("cannot open " + path + ": " + reason);
    }
    if (status == F_ERR_NOT_RCF || status == F_ERR_READ) {
        throw Failure(path + " is not a record file (it does not begin with the tag \"QTA_\")");
    }
    if (status == F_EOF) throw Failure(path + ": the record-file header is truncated");
    throw Failure(path + ": cannot read the record-file header: status " + statusText(status));
}

namespace {

std::string tagText(const char tag[4]) {
    bool printableTag = true;
    for (int i = 0; i < 4; ++i) printableTag = printableTag && tag[i] >= 0x20 && tag[i] < 0x7F;
    if (printableTag) return std::string(tag, 4);
    char hex[16];
    std::snprintf(hex, sizeof(hex), "0x%02x%02x%02x%02x", static_cast<unsigned char>(tag[0]),
                  static_cast<unsigned char>(tag[1]), static_cast<unsigned char>(tag[2]),
                  static_cast<unsigned char>(tag[3]));
    return hex;
}

}  // namespace

const char* kindDescription(FileKind kind) {
    switch (kind) {
    case FileKind::Grid: return "gridded data file";
    case FileKind::Xsec: return "cross-section file";
    case FileKind::Vre: return "VRE file (panel-body responses)";
    case FileKind::Unknown: break;
    }
    return "record file of an unknown application";
}

namespace {

bool hostIsLittleEndian() {
    const uint16_t one = 1;
    unsigned char first = 0;
    std::memcpy(&first, &one, 1);
    return first == 1;
}

}  // namespace

Value describeRecordFile(const RecordFileInfo& file) {
    Value doc = Value::object();
    doc.add("file", file.fullPath.empty() ? file.path : file.fullPath);
    doc.add("kind", kindId(file.kind));
    doc.add("description", kindDescription(file.kind));
    doc.add("size", file.size);
    const bool little = hostIsLittleEndian() != file.swapped;
    doc.add("byteOrder",
            std::string(little ? "little-endian" : "big-endian") + (file.swapped ? " (swapped on this machine)" : ""));
    doc.add("applicationTag", tagText(file.appTag));
    doc.add("created", file.created);
    doc.add("edited", file.edited);
    doc.add("rcfBase", file.rcfBase);
    doc.add("appBase", file.appBase);
    Value& versions = doc.add("versions", Value::object());
    versions.add("layerCreated", file.versionCreate);
    versions.add("layerEdited", file.versionEdit);
    versions.add("applicationCreated", file.versionCreateApp);
    versions.add("applicationEdited", file.versionEditApp);
    return doc;
}

void printOut(const std::string& text) {
    if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size() || std::fflush(stdout) != 0) {
        throw Failure("cannot write to standard output");
    }
}

}  // namespace tova_cli
