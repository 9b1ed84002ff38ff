// Gridded data-file layer, crash recovery: the walk over the time steps on
// disk (shared with appending) and the two exported calls that count the
// complete time steps of a file and bring its header up to date with them.
//
// A writer killed while it writes leaves the time steps it wrote whole, an
// unfinished one after them, and a header that counts only the steps of its
// last update (at most one a second). The walk passes over every record by
// its header alone: the values are never read, so a file of many gigabytes
// is walked in a moment. Nothing the file claims is trusted: a record that
// does not fit in the file, a block of the wrong kind or a record of another
// type or count than the item's ends the walk at the last complete step.
#include "grd/grdrecover.h"

#include <filesystem>
#include <system_error>

#include "common/capi.h"
#include "grd/fileio.h"
#include "grd/grdio.h"
#include "grd/grdstatic.h"
#include "grd/grdstream.h"
#include "rcf/rcf_internal.h"

namespace {

constexpr const char* kModule = "..\\grd\\grdopen";

bool timeInBlock(int32_t fileType) { return fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS; }

// Passes over the logical block at the position, mark to terminator; false
// when it is no block or does not end inside the file.
bool skipBlock(FileHandle file, uint32_t* identifier) {
    if (rcfQuery(file, identifier) != RCF_BLOCK) return false;
    rcfSkip(file);
    for (;;) {
        uint32_t count = 0;
        const int32_t type = rcfQuery(file, &count);
        if (type == 0 || type == RCF_BLOCK) return false;
        rcfSkip(file);
        if (rcfPeekError(file) != F_NO_ERROR) return false;
        if (type == RCF_TERMINATOR) return true;
    }
}

// Reads the block that opens a time step: a 50001 block, empty or holding
// the time as one double by the file type.
bool readStepBlock(const GrdHeader* header, FileHandle file, double* time) {
    uint32_t identifier = 0;
    if (rcfQuery(file, &identifier) != RCF_BLOCK || identifier != kTagTimeStep) return false;
    GrdRecordList block;
    uint32_t nodes = 0;
    rcfBlockRead(file, &nodes, &block.list);
    if (rcfPeekError(file) != F_NO_ERROR) return false;
    if (!timeInBlock(header->fileType)) return nodes == 0;
    const LrecNode* n = block.list;
    if (nodes != 1 || n == nullptr || n->type != RCF_DOUBLE || n->count != 1 || n->data == nullptr) return false;
    *time = *static_cast<const double*>(n->data);
    return true;
}

// Passes over one complete time step; false when it is not whole.
bool skipStep(const GrdHeader* header, FileHandle file, double* time) {
    if (!readStepBlock(header, file, time)) return false;
    for (int32_t i = 0; i < header->noOfItems; ++i) {
        const GrdItem* item = &header->items[i];
        uint32_t count = 0;
        const int32_t type = rcfQuery(file, &count);
        if (type != item->dataType || static_cast<int64_t>(count) != grdItemUsedElementCount(item)) return false;
        if (!rcfFits(file, 5 + static_cast<uint64_t>(grdSimpleTypeSize(type)) * count)) return false;
        rcfSkip(file);
        if (rcfPeekError(file) != F_NO_ERROR) return false;
    }
    return true;
}

int64_t fileLength(FileHandle file) {
    std::error_code ec;
    const auto size = std::filesystem::file_size(std::filesystem::path(file->filname), ec);
    return ec ? 0 : static_cast<int64_t>(size);
}

}  // namespace

bool grdStepsWalkable(int32_t fileType) {
    return fileType == F_EQTIME_FIXEDSPACE_ALLITEMS || fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS;
}

int32_t grdWalkTimeSteps(HeaderHandle header, FileHandle file, GrdStepWalk* walk) {
    *walk = GrdStepWalk{};
    walk->section = file->ownerMark;
    walk->length = fileLength(file);
    walk->end = rcfTell64(file);
    // The blocks before the dynamic data: static items, or nothing.
    while (walk->section < kSectionDynamic) {
        uint32_t identifier = 0;
        const int32_t type = rcfQuery(file, &identifier);
        if (type == 0 && walk->end == walk->length) break;  // the file ends before any data
        if (!skipBlock(file, &identifier)) {
            rcfGetError(file);
            grdSeekTo(file, walk->end);
            return grdReportError(header, file, 0, F_ERR_NOT_BLOCK, kModule, __LINE__);
        }
        if (identifier == kTagStaticStart) walk->section = kSectionStatic;
        if (identifier == kTagDynamicStart) walk->section = kSectionDynamic;
        walk->end = rcfTell64(file);
    }
    if (walk->section == kSectionDynamic && header->noOfItems > 0 && header->items) {
        for (double time = 0; walk->complete < INT32_MAX; ++walk->complete) {
            if (!skipStep(header, file, &time)) break;
            if (timeInBlock(header->fileType)) {
                if (walk->complete == 0) walk->firstTime = time;
                if (walk->largestTime == F_DELETE_VALUE_DOUBLE || time > walk->largestTime) walk->largestTime = time;
            }
            walk->end = rcfTell64(file);
        }
    }
    rcfGetError(file);  // the end of the walk is no failure
    grdSeekTo(file, walk->end);
    return F_NO_ERROR;
}

bool grdApplyStepWalk(GrdHeader* header, const GrdStepWalk& walk) {
    GrdTimeValues* v = grdTimeAxisValues(header);
    if (v == nullptr) return false;
    bool changed = v->timeSteps != walk.complete;
    v->timeSteps = walk.complete;
    header->timeStepsDone = walk.complete;
    header->nextItem = 0;
    const int32_t kind = header->timeAxis.type;
    if ((kind == F_TM_NEQ_AXIS || kind == F_CAL_NEQ_AXIS) && timeInBlock(header->fileType)) {
        const double start = walk.complete > 0 ? walk.firstTime : v->start;
        const double span = walk.complete > 0 ? walk.largestTime - start : 0.0;
        changed = changed || v->start != start || v->step != span;
        v->start = start;
        v->step = span;
        header->largestTime = walk.complete > 0 ? walk.largestTime : F_DELETE_VALUE_DOUBLE;
    }
    return changed;
}

namespace {

// Opens name, checks that its time steps can be walked and walks them.
int32_t openAndWalk(const char* name, bool edit, GrdOpenedFile& opened, GrdStepWalk& walk) {
    int32_t status = edit ? grdFileEdit(name, &opened.header, &opened.file)
                          : grdFileRead(name, &opened.header, &opened.file);
    if (status != F_NO_ERROR) return status;
    if (!grdStepsWalkable(opened.header->fileType))
        return grdReportError(opened.header, opened.file, 0, F_ERR_DATA_TYPE, kModule, __LINE__);
    if (grdTimeAxisValues(opened.header) == nullptr)
        return grdReportError(opened.header, opened.file, 0, F_ERR_VALUE, kModule, __LINE__);
    return grdWalkTimeSteps(opened.header, opened.file, &walk);
}

int32_t scanFile(const char* name, int32_t* stepsFound, int32_t* stepsInHeader, int64_t* tailBytes,
                 bool repair) {
    if (stepsFound != nullptr) *stepsFound = 0;
    if (stepsInHeader != nullptr) *stepsInHeader = 0;
    if (tailBytes != nullptr) *tailBytes = 0;
    // A first look only reads: a consistent file stays byte for byte as it is
    // (an open for editing would renew its edit stamp).
    GrdStepWalk walk;
    bool agrees = true;
    {
        GrdOpenedFile opened;
        const int32_t status = openAndWalk(name, false, opened, walk);
        if (status != F_NO_ERROR) return status;
        if (stepsInHeader != nullptr) *stepsInHeader = grdTimeAxisValues(opened.header)->timeSteps;
        agrees = !grdApplyStepWalk(opened.header, walk);
    }
    if (stepsFound != nullptr) *stepsFound = walk.complete;
    if (tailBytes != nullptr) *tailBytes = walk.length - walk.end;
    if (!repair || agrees) return F_NO_ERROR;

    GrdOpenedFile opened;
    GrdStepWalk again;
    int32_t status = openAndWalk(name, true, opened, again);
    if (status != F_NO_ERROR) return status;
    grdApplyStepWalk(opened.header, again);
    if (stepsFound != nullptr) *stepsFound = again.complete;
    status = grdUpdateHeaderTime(opened.header, 1, opened.file);
    const int32_t closed = FCloseFile(&opened.file);
    if (status == F_NO_ERROR) status = closed;
    if (status != F_NO_ERROR) return status;

    // A damaged header may hold what the update cannot bring in line (a
    // second time-axis block, say: the reader keeps the last, the update
    // rewrites the first). Only a header that now agrees counts as repaired.
    GrdOpenedFile check;
    GrdStepWalk after;
    status = openAndWalk(name, false, check, after);
    if (status != F_NO_ERROR) return status;
    if (grdApplyStepWalk(check.header, after))
        return grdReportError(check.header, check.file, 0, F_ERR_VALUE, kModule, __LINE__);
    return F_NO_ERROR;
}

}  // namespace

extern "C" {

int32_t TOVA_CALL grdFileScan(const char* name, int32_t* stepsFound, int32_t* stepsInHeader, int64_t* tailBytes) {
    GrdApiTrace trace("grdFileScan <%s>", grdTraceText(name));
    return trace.done(
        tova::guarded([&] { return scanFile(name, stepsFound, stepsInHeader, tailBytes, false); }));
}

int32_t TOVA_CALL grdFileRecover(const char* name, int32_t* stepsFound, int32_t* stepsInHeader) {
    GrdApiTrace trace("grdFileRecover <%s>", grdTraceText(name));
    return trace.done(tova::guarded([&] { return scanFile(name, stepsFound, stepsInHeader, nullptr, true); }));
}

}  // extern "C"
