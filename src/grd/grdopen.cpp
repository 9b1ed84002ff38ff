// Gridded data-file layer, module grdopen: the file lifecycle. Creates a
// data file (record file "GRD_" version 206, header stream, encoding keys as
// the first static items of a compressed file), opens one for reading,
// editing or appending (header and encoding keys read back), brings the
// header on disk up to date (flush), finishes and closes it, and deletes it.
//
// Every open yields a header and a file handle together or neither: a failed
// open closes what it opened and destroys what it read. A file opened for
// writing is closed only after its header was rewritten completely.
#include <cctype>
#include <cstdio>
#include <cstring>
#include <string>

#include "common/capi.h"
#include "grd/fileio.h"
#include "grd/grdio.h"
#include "grd/grdrecover.h"
#include "grd/grdstatic.h"
#include "grd/grdstream.h"
#include "platform/platform.h"
#include "qty/qty.h"
#include "tova/workspace.h"

namespace {

constexpr const char* kModule = "..\\grd\\grdopen";

int32_t report(HeaderHandle header, FileHandle file, int32_t code, int32_t line) {
    return grdReportError(header, file, 0, code, kModule, line);
}

// ---- Names -----------------------------------------------------------------------

using platform::PathKind;
using platform::pathKind;

bool emptyName(const char* name) { return name == nullptr || name[0] == '\0'; }

// Files of the legacy family: the extension of the last path component,
// lowered, begins with ".dt" or ".ct" and a digit 0-4 (what follows is not
// looked at).
bool isLegacyName(const char* name) {
    const char* base = name;
    for (const char* p = name; *p != '\0'; ++p)
        if (*p == '/' || *p == '\\' || *p == ':') base = p + 1;
    const char* ext = std::strrchr(base, '.');
    if (ext == nullptr || std::strlen(ext) < 4) return false;
    const auto lower = [](char c) { return static_cast<char>(std::tolower(static_cast<unsigned char>(c))); };
    return (lower(ext[1]) == 'd' || lower(ext[1]) == 'c') && lower(ext[2]) == 't' && ext[3] >= '0' && ext[3] <= '4';
}

// Replaces a shell shortcut by its target; false when it cannot be resolved.
// Where the system has no shell shortcuts a name ending in .lnk is an
// ordinary file.
bool resolveShortcut(std::string& name) {
    if (!platform::shortcutsResolve() || TdShortCut_IsShortcut(name.c_str()) == 0) return true;
    char target[1024] = {};
    if (TdShortCut_ResolveShortcut(name.c_str(), target) < 0 || target[0] == '\0') return false;
    name = target;
    return true;
}

// ---- Opening -------------------------------------------------------------------

// Whether a static item can be an encoding key: 4-byte integers on an
// equidistant one-dimensional axis.
bool isKeyItem(const GrdStaticItem* item) {
    return item->axisType == F_EQ_AXIS_D1 && (item->dataType == RCF_INT4 || item->dataType == RCF_UINT4);
}

// Loads the encoding keys of a compressed file from its first static items,
// by position: X, Y, Z. The element count of the X key becomes the key
// length; a shorter Y or Z key is zero-padded to it, so that no key can be
// read past its end. The file is left after the keys: a static item that is
// no key (the caller's first one, in a file with fewer than three keys) is
// put back, so that the caller's first static read still yields it.
int32_t loadEncodingKeys(HeaderHandle header, FileHandle file) {
    GrdArray<int32_t>* slots[3] = {&header->keyX, &header->keyY, &header->keyZ};
    for (GrdArray<int32_t>* slot : slots) {
        int32_t status = F_NO_ERROR;
        const int64_t before = rcfTell64(file);
        ItemHandle handle = grdStaticRead(file, &status);
        if (handle == nullptr) return status;  // fewer keys than three, or a failure
        const GrdStaticItem* item = grdAsStatic(handle);
        const bool isKey = isKeyItem(item);
        const int64_t length = item->valueBytes / 4;
        GrdArray<int32_t> key;
        if (isKey) {
            key = grdAllocArray<int32_t>(length > header->keyLength ? length : header->keyLength);
            if (key && length > 0) std::memcpy(key.get(), item->values.get(), static_cast<size_t>(length) * 4);
        }
        grdStaticDestroy(&handle);
        if (!isKey) {
            grdSeekTo(file, before);
            return rcfPeekError(file) > F_EOF ? report(header, file, F_ERR_SEEK, __LINE__) : F_NO_ERROR;
        }
        if (!key) return report(header, file, F_ERR_MEMORY, __LINE__);
        if (slot == &header->keyX) {
            if (length > INT32_MAX) return report(header, file, F_ERR_VALUE, __LINE__);
            header->keyLength = static_cast<int32_t>(length);
        }
        *slot = std::move(key);
    }
    return F_NO_ERROR;
}

// For a file open for writing: the largest time written so far is the end of
// the stored span of a non-equidistant axis, so that rewriting the span on
// close keeps it.
void restoreLargestTime(HeaderHandle header) {
    const int32_t kind = header->timeAxis.type;
    const GrdTimeValues* values = grdTimeAxisValues(header);
    if ((kind == F_TM_NEQ_AXIS || kind == F_CAL_NEQ_AXIS) && values != nullptr && values->timeSteps > 0)
        header->largestTime = values->start + values->step;
}

// Opens name for reading or editing, reads its header and, for a compressed
// file, its encoding keys.
int32_t openAndReadHeader(const char* name, bool edit, GrdOpenedFile& out) {
    int32_t status = F_NO_ERROR;
    out.file = edit ? FOpenFileEdit(name, &status) : FOpenFileRead(name, &status);
    if (out.file == nullptr) return status;
    rcfSeekAppBase(out.file);
    out.header = grdReadHeader(out.file, &status);
    if (status != F_NO_ERROR || out.header == nullptr) {
        report(out.header, out.file, F_ERR_OPEN, __LINE__);
        return status != F_NO_ERROR ? status : F_ERR_OPEN;
    }
    if (out.header->fileCompressed != 0) status = loadEncodingKeys(out.header, out.file);
    if (status == F_NO_ERROR && edit) restoreLargestTime(out.header);
    return status;
}

// Where the end of a file lies, looked for from the current position after
// the header: 3 when a dynamic section (50000) exists, 2 when static items
// follow (40000) but no dynamic data, else the state the file has. Data
// appended at the end must continue that section: a file without a dynamic
// section gets its 50000 block from the first time step written.
int32_t sectionAtEnd(FileHandle file, uint32_t* section) {
    *section = file->ownerMark;
    while (*section < kSectionDynamic) {
        uint32_t id = 0;
        const int32_t type = rcfQuery(file, &id);
        if (type == 0) break;  // end of file or a failure
        if (type != RCF_BLOCK || id == kTagDynamicStart) {
            *section = kSectionDynamic;
            break;
        }
        if (id == kTagStaticStart && *section < kSectionStatic) *section = kSectionStatic;
        if (FSkipLogicalBlock(file) != F_NO_ERROR) {
            const int32_t error = rcfGetError(file);  // reported by the skip
            return error > F_EOF ? error : F_NO_ERROR;
        }
    }
    const int32_t error = rcfGetError(file);
    return error > F_EOF ? report(nullptr, file, error, __LINE__) : F_NO_ERROR;
}

// Cuts the file at offset: what follows is an unfinished time step that the
// data written next must replace, not leave behind.
bool truncateAt(FileHandle file, int64_t offset) {
    grdSeekTo(file, offset);
    if (std::fflush(file->stream) != 0) return false;
    if (!platform::streamTruncate(file->stream, offset)) return false;
    file->knownSize = offset;
    return true;
}

// Positions a file opened for appending after its last complete time step.
// The cursor counts the complete time steps on disk, so that a file whose
// header lags behind its data (a writer that was killed) is continued where
// its data end and its header is right again at close; an unfinished time
// step after them is cut off.
int32_t appendAfterLastStep(HeaderHandle header, FileHandle file) {
    GrdStepWalk walk;
    const int32_t status = grdWalkTimeSteps(header, file, &walk);
    if (status != F_NO_ERROR) return status;
    if (walk.partial() && !truncateAt(file, walk.end)) return report(header, file, F_ERR_WRITE, __LINE__);
    grdSeekTo(file, walk.end);
    file->ownerMark = walk.section;
    grdApplyStepWalk(header, walk);
    return F_NO_ERROR;
}

// ---- Creating ------------------------------------------------------------------

// Writes one encoding key as a static item.
int32_t writeKey(HeaderHandle header, FileHandle file, const char* name, const int32_t* key) {
    ItemHandle item = nullptr;
    int32_t status = grdStaticCreate(&item);
    if (status != F_NO_ERROR) return status;
    status = grdSetItemInfo(header, item, QTY_ITEM_UNDEFINED, name, QTY_UNIT_UNDEFINED, RCF_INT4);
    if (status == F_NO_ERROR) status = grdSetItemAxisEqD1(item, QTY_UNIT_UNDEFINED, header->keyLength, 0.0f, 1.0f);
    if (status == F_NO_ERROR) status = grdStaticWrite(item, file, key);
    grdStaticDestroy(&item);
    return status;
}

int32_t writeEncodingKeys(HeaderHandle header, FileHandle file) {
    const struct {
        const char* name;
        const int32_t* key;
    } keys[3] = {{"X-Encoding Key", header->keyX.get()},
                 {"Y-Encoding Key", header->keyY.get()},
                 {"Z-Encoding Key", header->keyZ.get()}};
    for (const auto& k : keys) {
        if (k.key == nullptr) continue;
        const int32_t status = writeKey(header, file, k.name, k.key);
        if (status != F_NO_ERROR) return status;
    }
    return F_NO_ERROR;
}

int32_t createFile(const char* name, HeaderHandle header, FileHandle* outFile, int32_t readable) {
    // The folders come first, whatever the name turns out to be.
    if (name != nullptr) TdCreateFolder(name);
    if (emptyName(name) || pathKind(name) == PathKind::Directory) return F_ERR_WRITE;  // not reported

    int32_t status = grdCheckHeader(header, kModule, __LINE__);
    if (status == F_NO_ERROR && outFile == nullptr) status = report(header, nullptr, F_ERR_ARGUMENT, __LINE__);
    if (status != F_NO_ERROR) {
        if (outFile != nullptr) *outFile = nullptr;
        return status;
    }
    *outFile = nullptr;
    // Files of the legacy family would go to the legacy translator; none ships.
    if (isLegacyName(name)) return report(header, nullptr, F_ERR_VALUE, __LINE__);

    FileHandle file = FOpenFileCreate(name, readable);
    if (file == nullptr) return report(header, nullptr, F_ERR_OPEN, __LINE__);
    // A new file has no time steps yet: the cursor starts at its beginning
    // even when the header served another file before.
    header->nextItem = 0;
    header->timeStepsDone = 0;
    header->currentTime = 0.0;
    header->largestTime = F_DELETE_VALUE_DOUBLE;
    status = grdWriteHeader(header, file);
    if (status == F_NO_ERROR && header->fileCompressed != 0) status = writeEncodingKeys(header, file);
    if (status == F_NO_ERROR) {
        if (std::fflush(file->stream) != 0) status = report(header, file, F_ERR_FLUSH, __LINE__);
        file->openClock = rcfClockMs();
    }
    if (status != F_NO_ERROR) {
        // A file whose header could not be written describes nothing: it is
        // closed and removed, and no handle is given out.
        FCloseFile(&file);
        std::remove(name);
        return status;
    }
    *outFile = file;
    return F_NO_ERROR;
}

// ---- Reading, editing, appending --------------------------------------------------

// Clears the out arguments given. Both are needed (a handle with nowhere to
// go could never be closed): 1000 when one is missing.
int32_t clearOuts(HeaderHandle* outHeader, FileHandle* outFile) {
    if (outHeader != nullptr) *outHeader = nullptr;
    if (outFile != nullptr) *outFile = nullptr;
    return outHeader == nullptr || outFile == nullptr ? report(nullptr, nullptr, F_ERR_ARGUMENT, __LINE__)
                                                      : F_NO_ERROR;
}

int32_t readFile(const char* name, HeaderHandle* outHeader, FileHandle* outFile) {
    if (outHeader != nullptr) *outHeader = nullptr;
    if (outFile != nullptr) *outFile = nullptr;
    if (emptyName(name) || pathKind(name) != PathKind::File) return F_ERR_OPEN;  // not reported
    std::string path(name);
    if (!resolveShortcut(path)) return F_ERR_OPEN;
    const int32_t outs = clearOuts(outHeader, outFile);
    if (outs != F_NO_ERROR) return outs;
    // Files of the legacy family would go to the legacy translator; none ships.
    if (isLegacyName(path.c_str())) return report(nullptr, nullptr, F_ERR_VALUE, __LINE__);
    GrdOpenedFile opened;
    const int32_t status = openAndReadHeader(path.c_str(), false, opened);
    if (status == F_NO_ERROR) opened.handOver(outHeader, outFile);
    return status;
}

int32_t editFile(const char* name, HeaderHandle* outHeader, FileHandle* outFile) {
    const int32_t outs = clearOuts(outHeader, outFile);
    if (outs != F_NO_ERROR) return outs;
    GrdOpenedFile opened;
    const int32_t status = openAndReadHeader(name, true, opened);
    if (status == F_NO_ERROR) opened.handOver(outHeader, outFile);
    return status;
}

int32_t appendFile(const char* name, HeaderHandle* outHeader, FileHandle* outFile, const GrdApiTrace& trace) {
    int32_t status = clearOuts(outHeader, outFile);
    if (status != F_NO_ERROR) return status;
    GrdOpenedFile opened;
    status = openAndReadHeader(name, true, opened);
    if (opened.file == nullptr) {
        trace.print("F_ERR_OPEN");
        return status;
    }
    if (status != F_NO_ERROR) {
        trace.print("Error %d", status);
        return status;
    }
    if (grdStepsWalkable(opened.header->fileType)) {
        status = appendAfterLastStep(opened.header, opened.file);
        if (status != F_NO_ERROR) return status;
    } else {
        uint32_t section = kSectionHeader;
        status = sectionAtEnd(opened.file, &section);
        if (status != F_NO_ERROR) return status;
        rcfSeek64(opened.file, 0, 0, 2);  // the end of the file
        opened.file->ownerMark = section;
        GrdTimeValues* values = grdTimeAxisValues(opened.header);
        if (values != nullptr) opened.header->timeStepsDone = values->timeSteps;
    }
    if (rcfPeekError(opened.file) != F_NO_ERROR) {
        trace.print("F_ERR_SEEK");
        return report(opened.header, opened.file, F_ERR_SEEK, __LINE__);
    }
    trace.print("F_NO_ERROR = OK");
    opened.handOver(outHeader, outFile);
    return F_NO_ERROR;
}

// ---- Flushing and closing ------------------------------------------------------------

// The header on disk is brought up to date at once while fewer than two time
// steps are written and the cursor stands at the first item; later at most
// once a second.
int32_t forceFlag(HeaderHandle header) { return header->timeStepsDone < 2 && header->nextItem == 0 ? 1 : 0; }

// A file that holds nothing after its header gets the empty block that
// starts its dynamic section: a header is read up to the block that follows
// it, so a header alone could not be read back. The file position stays in
// front of that block, so the data written next (a 40000 block of the same
// length, or the 50000 block itself) replaces it and the file ends up as if
// the block had never been written. Only at the end of the file: what
// follows the header is never written over.
int32_t markEndOfHeader(HeaderHandle header, FileHandle file) {
    if (file->readOnly != 0 || file->ownerMark != kSectionHeader || file->error != F_NO_ERROR) return F_NO_ERROR;
    const int64_t at = rcfTell64(file);
    rcfSeek64(file, 0, 0, 2);
    if (rcfTell64(file) == at) {
        const int32_t status = grdCheckWriteLB(header, kTagDynamicStart, nullptr, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
    }
    grdSeekTo(file, at);
    return F_NO_ERROR;
}

// Both flushes hand the stream's bytes to the system whatever the throttle
// decides about the header; a write that failed before (reported then) is
// returned again, since the bytes after it never reached the file. sync
// forces the header update and then has the system put the file on its
// storage device.
template <class Update>
int32_t flushFile(HeaderHandle header, FileHandle file, Update update, bool sync = false) {
    // A file of the legacy translator would be flushed by it here; none ships.
    int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
    if (status != F_NO_ERROR) return status;
    status = markEndOfHeader(header, file);
    if (status == F_NO_ERROR) status = update(header, sync ? 1 : forceFlag(header), file);
    TdProject_AddFile(file->filname);
    if (status == F_NO_ERROR && file->error > F_EOF) status = file->error;
    if (status == F_NO_ERROR && sync && !platform::streamSync(file->stream)) status = report(header, file, F_ERR_FLUSH, __LINE__);
    return status;
}

int32_t closeFile(HeaderHandle header, FileHandle* file) {
    // A file of the legacy translator would be closed by it here; none ships.
    const FileHandle handle = file != nullptr ? *file : nullptr;
    int32_t status = grdCheckHeaderFile(header, handle, kModule, __LINE__);
    if (status != F_NO_ERROR) return status;
    int32_t pending = F_NO_ERROR;
    if (handle->readOnly == 0) {
        status = markEndOfHeader(header, handle);
        if (status == F_NO_ERROR) status = grdUpdateHeader(header, 1, handle);
        TdProject_AddFile(handle->filname);
        if (status != F_NO_ERROR) return status;  // the file stays open: the caller may retry
        // A write that failed earlier (and was reported then) still marks the
        // file as incomplete: the close says so.
        pending = handle->error > F_EOF ? handle->error : F_NO_ERROR;
    }
    status = FCloseFile(file);
    return status != F_NO_ERROR ? status : pending;
}

int32_t deleteFile(const char* name) {
    if (emptyName(name) || pathKind(name) != PathKind::File) return F_ERR_ARGUMENT;  // not reported
    std::string path(name);
    if (!resolveShortcut(path)) return F_ERR_ARGUMENT;
    std::remove(path.c_str());  // the result does not matter
    return F_NO_ERROR;
}

const char* traceName(const char* name) { return grdTraceText(name); }

}  // namespace

// ---- Exported interface ------------------------------------------------------------------

extern "C" {

int32_t TOVA_CALL grdFileCreate(const char* name, HeaderHandle header, FileHandle* file) {
    return grdFileCreateEx(name, header, file, 0);
}

int32_t TOVA_CALL grdFileCreateEx(const char* name, HeaderHandle header, FileHandle* file, int32_t readable) {
    GrdApiTrace trace("grdFileCreate <%s>", traceName(name));
    return trace.done(tova::guarded([&] { return createFile(name, header, file, readable); }));
}

int32_t TOVA_CALL grdFileRead(const char* name, HeaderHandle* header, FileHandle* file) {
    GrdApiTrace trace("grdFileRead <%s>", traceName(name));
    return trace.done(tova::guarded([&] { return readFile(name, header, file); }));
}

int32_t TOVA_CALL grdFileEdit(const char* name, HeaderHandle* header, FileHandle* file) {
    GrdApiTrace trace("grdFileEdit <%s>", traceName(name));
    return trace.done(tova::guarded([&] { return editFile(name, header, file); }));
}

int32_t TOVA_CALL grdFileAppend(const char* name, HeaderHandle* header, FileHandle* file) {
    GrdApiTrace trace("grdFileAppend <%s>", traceName(name));
    return trace.done(tova::guarded([&] { return appendFile(name, header, file, trace); }));
}

int32_t TOVA_CALL grdFileFlush(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdFileFlush");
    return trace.done(tova::guarded([&] { return flushFile(header, file, grdUpdateHeader); }));
}

int32_t TOVA_CALL grdFileFlushTimeStep(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdFileFlushTimeStep");
    return trace.done(tova::guarded([&] { return flushFile(header, file, grdUpdateHeaderTime); }));
}

int32_t TOVA_CALL grdFileSync(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdFileSync");
    return trace.done(tova::guarded([&] { return flushFile(header, file, grdUpdateHeader, true); }));
}

int32_t TOVA_CALL grdFileClose(HeaderHandle header, FileHandle* file) {
    GrdApiTrace trace("grdFileClose");
    return trace.done(tova::guarded([&] { return closeFile(header, file); }));
}

int32_t TOVA_CALL grdFileDelete(const char* name) {
    GrdApiTrace trace("grdFileDelete <%s>", traceName(name));
    return trace.done(tova::guarded([&] { return deleteFile(name); }));
}

}  // extern "C"
