// Gridded data files, module fileio: the file-open and logical-block layer
// over the record layer (traced under the file-I/O flag), and the checked
// record and block transfers through which the header and data code reach
// the record layer (traced under the API flag). Every failure of the record
// layer is re-reported here through the grd status dispatcher, so user
// handlers see it.
#include "grd/fileio.h"

#include <cstring>

#include "grd/grdio.h"
#include "trace/trace_internal.h"
#include "tova/trace.h"

namespace {

constexpr const char* kModule = "..\\grd\\fileio";

int32_t report(FileHandle file, int32_t code, int32_t line) {
    return grdReportError(nullptr, file, 0, code, kModule, line);
}

// The checked transfers trace their own name and "[%d]" under the API flag.
class ApiTrace {
public:
    explicit ApiTrace(const char* name) : on_(tova::traceApiOn()) {
        if (on_) DebugEnter(name);
    }
    int32_t result(int32_t code) const {
        if (on_) DebugExit("[%d]", code);
        return code;
    }

private:
    bool on_;
};

const char* printable(const char* text) { return text != nullptr ? text : ""; }

// The three opens differ only in the record-layer call and the entry text,
// which is also where the tracer takes the call's name from. Each traced
// call reads its flag once so that its enter and exit lines always pair.
template <class Open>
FileHandle openTraced(const char* enterFormat, const char* path, int32_t* status, int32_t line, Open open) {
    const bool trace = tova::traceFileIoOn();
    if (trace) DebugEnter(enterFormat, printable(path));
    FileHandle file = nullptr;
    const int32_t code = open(&file);
    if (code == 0) {
        file->ownerMark = 1;
    } else {
        report(nullptr, code, line);
    }
    if (status != nullptr) *status = code;
    if (trace) DebugExit("%p [%d]", static_cast<void*>(file), code);
    return file;
}

}  // namespace

uint32_t grdAppIdent(uint32_t* version) {
    if (version != nullptr) *version = kGrdAppVersion;
    uint32_t tag = 0;
    std::memcpy(&tag, "GRD_", 4);
    return tag;
}

// ---- File-open layer -------------------------------------------------------

FileHandle FOpenFileCreate(const char* path, int32_t readBack) {
    return openTraced("FOpenFileCreate <%s>", path, nullptr, __LINE__, [&](FileHandle* file) {
        return rcfFileOpenCreate(path, "FOpenFileCreate", file, grdAppIdent, readBack);
    });
}

FileHandle FOpenFileRead(const char* path, int32_t* status) {
    return openTraced("FOpenFileRead <%s>", path, status, __LINE__, [&](FileHandle* file) {
        uint32_t appTag = 0;  // checked by the record layer, not needed here
        return rcfFileOpenRead(path, file, grdAppIdent, &appTag);
    });
}

FileHandle FOpenFileEdit(const char* path, int32_t* status) {
    return openTraced("FOpenFileEdit <%s>", path, status, __LINE__, [&](FileHandle* file) {
        uint32_t appTag = 0;
        return rcfFileOpenEdit(path, file, grdAppIdent, &appTag);
    });
}

int32_t FCloseFile(FileHandle* file) {
    const bool trace = tova::traceFileIoOn();
    const FileHandle handle = file != nullptr ? *file : nullptr;
    if (trace) DebugEnter("FCloseFile Fp->filname=<%s>", handle != nullptr ? printable(handle->filname) : "");
    const int32_t code = rcfFileClose(file);
    // The object is gone once the close has run, failed or not: handlers
    // get no file rather than a dangling one.
    if (code != 0) report(nullptr, code, __LINE__);
    if (trace) DebugExit("%p [%d]", static_cast<void*>(handle), code);
    return code;
}

// ---- Logical blocks --------------------------------------------------------

LrecNode* FCreateLogicalBlock(int32_t type, uint32_t count, const void* data) {
    const bool trace = tova::traceFileIoOn();
    if (trace) DebugEnter("FCreateLogicalBlock %d %d", type, static_cast<int32_t>(count));
    LrecNode* node = rcfLrecNodeNew(type, count, data, 1, nullptr);
    if (node == nullptr) report(nullptr, F_ERR_VALUE, __LINE__);
    if (trace) DebugExit("%p", static_cast<void*>(node));
    return node;
}

int32_t FAppendToLogicalBlock(int32_t type, uint32_t count, const void* data, LrecNode* list) {
    const bool trace = tova::traceFileIoOn();
    if (trace) DebugEnter("FAppendToLogicalBlock %d %d", type, static_cast<int32_t>(count));
    LrecNode* node = nullptr;
    int32_t code = 0;
    if (list == nullptr) {
        code = report(nullptr, F_ERR_ARGUMENT, __LINE__);  // a node with no list would be lost
    } else {
        node = rcfLrecNodeNew(type, count, data, 1, list);
        if (node == nullptr) code = report(nullptr, F_ERR_VALUE, __LINE__);
    }
    if (trace) DebugExit("[%d] %p", code, static_cast<void*>(node));
    return code;
}

int32_t FFreeLogicalBlock(LrecNode* list) {
    const bool trace = tova::traceFileIoOn();
    if (trace) DebugEnter("FFreeLogicalBlock");
    rcfLrecListFree(&list);  // the caller's own pointer is left as it was
    if (trace) DebugExit("[%d]", 0);
    return 0;
}

int32_t FQueryLogicalBlock(FileHandle file) {
    const bool trace = tova::traceFileIoOn();
    if (trace) DebugEnter("FQueryLogicalBlock");
    uint32_t count = 0;
    const int32_t type = rcfQuery(file, &count);
    const int32_t result = type == RCF_BLOCK ? static_cast<int32_t>(count) : 0;
    // The exit text is kept as it has always been: "&d" prints literally.
    if (trace) DebugExit("%d &d", result, type);
    return result;
}

LrecNode* FReadLogicalBlock(FileHandle file) {
    const bool trace = tova::traceFileIoOn();
    if (trace) DebugEnter("FReadLogicalBlock");
    LrecNode* list = nullptr;
    uint32_t count = 0;
    rcfBlockRead(file, &count, &list);
    const int32_t error = rcfPeekError(file);
    if (error != 0) report(file, error, __LINE__);
    if (trace) DebugExit("[%d] %p", error, static_cast<void*>(list));
    return list;
}

int32_t FSkipLogicalBlock(FileHandle file) {
    const bool trace = tova::traceFileIoOn();
    if (trace) DebugEnter("FSkipLogicalBlock");
    rcfBlockSkip(file);
    const int32_t error = rcfPeekError(file);
    if (error != 0) report(file, error, __LINE__);
    if (trace) DebugExit("[%d]", error);
    return error;
}

// ---- Checked transfers -----------------------------------------------------

int32_t grdCheckTypeSize(HeaderHandle header, const LrecNode* block, int32_t type, uint32_t count,
                         const char* module, int32_t line) {
    const ApiTrace trace("grdCheckTypeSize");
    int32_t code = 0;
    if (block == nullptr) {
        code = F_ERR_READ;
    } else if (block->type != type) {
        code = F_ERR_TYPE;
    } else if (count != 0 && block->count != count) {
        code = F_ERR_SIZE;
    }
    if (code != 0) grdReportError(header, nullptr, 0, code, module, line);
    return trace.result(code);
}

int32_t grdCheckReadTypeSize(HeaderHandle header, FileHandle file, int32_t type, uint32_t count, LrecNode** block,
                             const char* module, int32_t line) {
    const ApiTrace trace("grdCheckReadTypeSize");
    if (block == nullptr) return trace.result(grdReportError(header, file, 0, F_ERR_ARGUMENT, module, line));
    *block = nullptr;
    if (file == nullptr) return trace.result(grdReportError(header, nullptr, 0, F_ERR_ARGUMENT, module, line));
    *block = FReadLogicalBlock(file);
    return trace.result(grdCheckTypeSize(header, *block, type, count, module, line));
}

int32_t grdCheckReadLB(HeaderHandle header, FileHandle file, LrecNode** block, uint16_t* identifier,
                       const char* module, int32_t line) {
    const ApiTrace trace("grdCheckReadLB");
    if (block != nullptr) *block = nullptr;
    if (file == nullptr) return trace.result(grdReportError(header, nullptr, 0, F_ERR_ARGUMENT, module, line));
    uint32_t count = 0;
    const uint16_t id = rcfBlockRead(file, &count, block);
    if (identifier != nullptr) *identifier = id;
    const int32_t error = rcfGetError(file);
    if (error != 0) grdReportError(header, file, 0, error, module, line);
    return trace.result(error);
}

int32_t grdCheckWriteLB(HeaderHandle header, uint16_t identifier, LrecNode* block, FileHandle file,
                        const char* module, int32_t line) {
    const ApiTrace trace("grdCheckWriteLB");
    const int32_t code = rcfBlockWrite(identifier, file, block);
    if (code != 0) grdReportError(header, file, 0, code, module, line);
    return trace.result(code);
}

int32_t grdCheckReadLR(HeaderHandle header, int32_t type, uint32_t count, void* buffer, FileHandle file,
                       const char* module, int32_t line) {
    const ApiTrace trace("grdCheckReadLR");
    rcfLrecRead(file, type, count, buffer);
    const int32_t error = rcfGetError(file);
    if (error != 0) grdReportError(header, file, 0, error, module, line);
    return trace.result(error);
}

int32_t grdCheckWriteLR(HeaderHandle header, int32_t type, uint32_t count, const void* buffer, FileHandle file,
                        const char* module, int32_t line) {
    const ApiTrace trace("grdCheckWriteLR");
    const int32_t code = rcfLrecWrite(file, type, count, buffer);
    if (code != 0) grdReportError(header, file, 0, code, module, line);
    return trace.result(code);
}

int32_t grdCheckSkipLR(HeaderHandle header, FileHandle file, const char* module, int32_t line) {
    const ApiTrace trace("grdCheckSkipLR");
    const int32_t type = rcfSkip(file);
    int32_t code = rcfGetError(file);
    if (code == 0 && (type <= 0 || rcfSimpValid(type) == 0)) code = F_ERR_SKIP;
    if (code != 0) grdReportError(header, file, 0, code, module, line);
    return trace.result(code);
}

int32_t grdCheckPseudoSkipLR(int32_t type, uint32_t count, FileHandle file) {
    const ApiTrace trace("grdCheckPseudoSkipLR");
    // The record's own header is 5 bytes; nothing is read or verified.
    const uint64_t bytes = static_cast<uint64_t>(rcfSimpSize(type) & 0xFFFFu) * count + 5;
    rcfSkipDeferred64(file, bytes);
    return trace.result(0);
}
