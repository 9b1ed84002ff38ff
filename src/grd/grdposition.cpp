// Gridded data-file layer, module grdposition: moves an open data file, and
// the header's cursor with it, to the static items, to a static item, to the
// dynamic data, to a time step or to an item of a time step. Block searches
// walk the file; a time step five or more steps ahead is reached by a jump
// of the measured length of one time step, checked on arrival, so that
// finding a time step costs the same wherever it lies.
#include <cstdint>
#include <vector>

#include "common/capi.h"
#include "grd/fileio.h"
#include "grd/grddynamic.h"
#include "grd/grdio.h"
#include "grd/grdplugin.h"
#include "grd/grdstream.h"

namespace {

constexpr const char* kModule = kModGrdPosition;
// From this many time steps ahead on, positioning jumps instead of skipping.
constexpr int32_t kJumpSteps = 5;

int32_t report(HeaderHandle header, FileHandle file, int32_t code, int32_t line) {
    return grdReportError(header, file, 0, code, kModule, line);
}

// Takes the file's pending error; a failure is reported, the end of the file
// (1) is handed back as it is.
int32_t takeError(HeaderHandle header, FileHandle file, int32_t line) {
    const int32_t error = rcfGetError(file);
    if (error > F_EOF) report(header, file, error, line);
    return error;
}

void resetCursor(GrdHeader* header) {
    header->nextItem = 0;
    header->timeStepsDone = 0;
}

// Positions just after the next block with the given code. The section
// starts rewind first when the file is already past them; passing a section
// start raises the section state, and passing beyond the wanted section
// ends the search (status 0, not found). The end of the file gives 1.
int32_t findBlock(FileHandle file, int32_t code) {
    uint32_t limit = kSectionHeader;
    bool rewind = false;
    if (code == kTagStaticStart) {
        limit = kSectionStatic;
        rewind = file->ownerMark >= kSectionStatic;
    } else if (code == kTagDynamicStart) {
        limit = kSectionDynamic;
        // There is one dynamic section: once met, go straight back to it.
        if (file->dynamicStart >= 0) {
            grdSeekTo(file, file->dynamicStart);
            if (file->error == F_NO_ERROR) file->ownerMark = kSectionDynamic;
            return takeError(nullptr, file, __LINE__);
        }
        rewind = file->ownerMark == kSectionDynamic;
    }
    if (rewind) {
        rcfSeekAppBase(file);
        file->ownerMark = kSectionHeader;
    }
    while (file->error == F_NO_ERROR) {
        uint32_t identifier = 0;
        const int32_t type = rcfQuery(file, &identifier);
        if (type == RCF_BLOCK) {
            if (identifier == kTagStaticStart) file->ownerMark = kSectionStatic;
            if (identifier == kTagDynamicStart) file->ownerMark = kSectionDynamic;
            rcfBlockSkip(file);
            if (file->error != F_NO_ERROR) break;
            if (identifier == kTagDynamicStart) file->dynamicStart = rcfTell64(file);
            if (file->ownerMark > limit || identifier == static_cast<uint32_t>(code)) return F_NO_ERROR;
        } else if (type != 0) {
            rcfSkip(file);  // a plain record, or a stray mark
        }
    }
    return takeError(nullptr, file, __LINE__);
}

// The fixed-space file types whose records follow from the header alone.
bool fixedSpace(const GrdHeader* header) {
    return header->fileType == F_EQTIME_FIXEDSPACE_ALLITEMS || header->fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS;
}

// Where each item's record starts within a time step, counted from the end
// of the time-step block (the last entry: where the step ends), for the
// fixed-space file types while no plug-in stands between; null otherwise or
// when an item's record size does not follow from the header. Worked out
// once and again only when the items change.
const int64_t* recordOffsets(GrdHeader* header) {
    if (!fixedSpace(header) || grdPluginRoutes(header) || header->noOfItems <= 0 || !header->items) return nullptr;
    GrdHeader::RecordOffsets& o = header->recordOffsets;
    if (o.items != header->items.get() || o.count != header->noOfItems || o.fileType != header->fileType ||
        o.compressed != header->fileCompressed || o.keyLength != header->keyLength || o.serial != header->layoutSerial) {
        o.at.clear();
        o.items = header->items.get();
        o.count = header->noOfItems;
        o.fileType = header->fileType;
        o.compressed = header->fileCompressed;
        o.keyLength = header->keyLength;
        o.serial = header->layoutSerial;
        std::vector<int64_t> at(static_cast<size_t>(header->noOfItems) + 1, 0);
        for (int32_t i = 0; i < header->noOfItems; ++i) {
            const GrdItem* item = &header->items[i];
            const int64_t used = grdItemUsedElementCount(item);
            const int64_t size = grdSimpleTypeSize(item->dataType);
            // The same records the cursor checks let through, no others.
            if (used <= 0 || size <= 0 || grdItemElementCount(item) <= 0 ||
                used > static_cast<int64_t>(UINT32_MAX) / size)
                return nullptr;
            at[static_cast<size_t>(i) + 1] = at[static_cast<size_t>(i)] + 5 + used * size;
        }
        o.at = std::move(at);
    }
    return o.at.empty() ? nullptr : o.at.data();
}

// Bytes of the block that opens a time step: start mark, tag and
// terminator, and for the non-equidistant type the time (a record of one
// double).
int64_t timeStepBlockBytes(const GrdHeader* header) {
    return header->fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS ? 3 + 5 + 8 + 1 : 3 + 1;
}

// The length of one time step as the header gives it; 0 when it does not.
int64_t stepLengthOf(GrdHeader* header) {
    const int64_t* at = recordOffsets(header);
    return at != nullptr ? timeStepBlockBytes(header) + at[header->noOfItems] : 0;
}

// 1001 when t lies outside 0 ... the time axis's count of time steps (the
// count itself is the position after the last step).
bool timeStepInRange(GrdHeader* header, int32_t t) {
    if (t < 0) return false;
    const GrdTimeValues* v = grdTimeAxisValues(header);
    return v == nullptr || t <= v->timeSteps;
}

// Whether a time-step block of the header's file type starts at the current
// position, or the position is exactly the end of the file. The position is
// left where it was.
bool timeStepStartsHere(GrdHeader* header, FileHandle file) {
    const int64_t here = rcfTell64(file);
    if (here < 0 || file->error != F_NO_ERROR) return false;
    uint32_t identifier = 0;
    const int32_t type = rcfQuery(file, &identifier);
    bool ok = false;
    if (type == RCF_BLOCK && identifier == kTagTimeStep) {
        LrecNode* list = nullptr;
        uint32_t records = 0;
        rcfBlockRead(file, &records, &list);
        const bool timeInBlock = header->fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS ||
                                 header->fileType == F_NEQTIME_FIXEDSPACE_VARITEMS ||
                                 header->fileType == F_NEQTIME_TVARSPACE_VARITEMS;
        ok = file->error == F_NO_ERROR &&
             (timeInBlock ? records == 1 && list->type == RCF_DOUBLE && list->count == 1 : records == 0);
        rcfLrecListFree(&list);
    } else if (type == 0 && file->error == F_EOF) {
        rcfSeek64(file, 0, 0, 2);
        ok = rcfTell64(file) == here;
    }
    file->error = F_NO_ERROR;  // what the probe met is no failure of the file
    grdSeekTo(file, here);
    return ok && file->error == F_NO_ERROR;
}

// Goes from the start of the dynamic data to time step t record by record,
// reading every record's own header: the way to a time step when the time
// steps differ in length.
int32_t walkToTimeStep(GrdHeader* header, FileHandle file, int32_t t) {
    int32_t status = grdFindBlockDynamic(header, file);
    // The file's own items, also while a plug-in offers others.
    const int64_t records = static_cast<int64_t>(grdFileItemCount(header)) *
        (header->fileType == F_EQTIME_TVARSPACE_ALLITEMS || header->fileType == F_NEQTIME_TVARSPACE_VARITEMS ? 2 : 1);
    for (int32_t step = 0; step < t && status == F_NO_ERROR; ++step) {
        LrecNode* list = nullptr;
        const uint16_t identifier = rcfBlockRead(file, nullptr, &list);
        rcfLrecListFree(&list);
        status = takeError(header, file, __LINE__);
        if (status == F_NO_ERROR && identifier != kTagTimeStep) status = report(header, file, F_ERR_VALUE, __LINE__);
        for (int64_t k = 0; k < records && status == F_NO_ERROR; ++k)
            status = grdCheckSkipLR(header, file, kModule, __LINE__);
    }
    if (status != F_NO_ERROR) return status;
    header->timeStepsDone = t;
    header->nextItem = 0;
    return F_NO_ERROR;
}

// Moves forward from the cursor to time step t (t at or after it): step by
// step for fewer than five steps, else by a jump of the measured length of
// one time step. Both assume time steps of the record lengths the header
// gives; where the position reached does not hold the start of a time step
// (or a step on the way was not what the header says) the time step is
// reached by walking the records instead, so a search never ends mid-record.
int32_t forwardToTimeStep(GrdHeader* header, FileHandle file, int32_t t) {
    int32_t status = F_NO_ERROR;
    int64_t measured = 0;
    if (t - header->timeStepsDone < kJumpSteps) {
        for (int32_t d = t - header->timeStepsDone; d > 0 && status == F_NO_ERROR; --d)
            status = grdSkipTimeStep(header, file);
    } else {
        if (header->nextItem != 0) status = grdSkipTimeStep(header, file);  // finish the current step
        const int64_t before = status == F_NO_ERROR ? rcfTell64(file) : -1;
        if (status == F_NO_ERROR) status = grdSkipTimeStep(header, file);
        const int64_t after = status == F_NO_ERROR ? rcfTell64(file) : -1;
        const int64_t length = after - before;
        const int64_t remaining = t - header->timeStepsDone;
        if (status == F_NO_ERROR && remaining > 0) {
            if (before >= 0 && length > 0 && length <= (INT64_MAX - after) / remaining) {
                grdSeekTo(file, after + remaining * length);
                header->timeStepsDone = t;
                measured = length;
            } else {
                status = F_ERR_SEEK;  // no such position: walk
            }
        }
    }
    if (status == F_NO_ERROR && timeStepStartsHere(header, file)) {
        if (measured > 0) file->timeStepLength = measured;
        return F_NO_ERROR;
    }
    if (file->error > F_EOF) return takeError(header, file, __LINE__);
    return walkToTimeStep(header, file, t);
}

// Once the start of the dynamic data and the length of a time step are
// known, every time step is one jump from the start (checked on arrival
// like any jump).
int32_t jumpFromStart(GrdHeader* header, FileHandle file, int32_t t) {
    grdSeekTo(file, file->dynamicStart + t * file->timeStepLength);
    if (file->error == F_NO_ERROR && timeStepStartsHere(header, file)) {
        file->ownerMark = kSectionDynamic;
        header->timeStepsDone = t;
        header->nextItem = 0;
        return F_NO_ERROR;
    }
    if (file->error > F_EOF) return takeError(header, file, __LINE__);
    file->timeStepLength = 0;  // the time steps are not all of that length
    return walkToTimeStep(header, file, t);
}

// Whether time step t of a file opened for reading is reached without a
// check on arrival: the length of a time step follows from the header and
// was confirmed by an earlier checked jump. (A file being written may end
// anywhere; its jumps are always checked.)
bool trustedJump(GrdHeader* header, FileHandle file, int32_t t, int64_t* position) {
    const int64_t length = stepLengthOf(header);
    if (file->readOnly == 0 || length <= 0 || file->timeStepLength != length || file->dynamicStart < 0 ||
        t > (INT64_MAX - file->dynamicStart) / length)
        return false;
    *position = file->dynamicStart + t * length;
    return true;
}

// Positions at time step t, item 1 (t already checked).
int32_t gotoTimeStep(GrdHeader* header, FileHandle file, int32_t t) {
    const bool inDynamic = file->ownerMark >= kSectionDynamic;
    const int32_t done = header->timeStepsDone;
    if (inDynamic && done == t && header->nextItem == 0) return F_NO_ERROR;
    int64_t position = 0;
    if (trustedJump(header, file, t, &position)) {
        grdSeekTo(file, position);
        if (file->error != F_NO_ERROR) return takeError(header, file, __LINE__);
        file->ownerMark = kSectionDynamic;
        header->timeStepsDone = t;
        header->nextItem = 0;
        return F_NO_ERROR;
    }
    // Where the header gives the length of a time step, the first jump
    // takes it (checked on arrival) instead of measuring one.
    const int64_t length = stepLengthOf(header);
    if (length > 0 && file->dynamicStart < 0) {
        const int32_t status = grdFindBlockDynamic(header, file);
        if (status != F_NO_ERROR) return status;
    }
    if (length > 0 && file->dynamicStart >= 0 && file->timeStepLength == 0) file->timeStepLength = length;
    const bool shortForward = length == 0 && inDynamic && done < t && t - done < kJumpSteps;
    if (!shortForward && file->dynamicStart >= 0 && file->timeStepLength > 0 &&
        t <= (INT64_MAX - file->dynamicStart) / file->timeStepLength)
        return jumpFromStart(header, file, t);
    if (!inDynamic || done >= t) {
        const int32_t status = grdFindBlockDynamic(header, file);
        if (status != F_NO_ERROR) return status;
    }
    return forwardToTimeStep(header, file, t);
}

// Whether a static item follows (passing the block that starts the static
// section first, as the static reader does); the position stays before it.
int32_t staticItemFollows(GrdHeader* header, FileHandle file, bool* found) {
    *found = false;
    if (file->ownerMark > kSectionStatic) return F_NO_ERROR;
    uint32_t identifier = 0;
    if (file->ownerMark < kSectionStatic && rcfQuery(file, &identifier) == RCF_BLOCK &&
        identifier == kTagStaticStart) {
        rcfBlockSkip(file);
        file->ownerMark = kSectionStatic;
    }
    *found = rcfQuery(file, &identifier) == RCF_BLOCK && (identifier == kTagItemText || identifier == kTagItem);
    if (*found) return F_NO_ERROR;
    const int32_t error = takeError(header, file, __LINE__);
    return error > F_EOF ? error : F_NO_ERROR;
}

// Moves the cursor within its time step to item `wanted` (0-based, after
// it) in one move of the file position, where the record offsets follow
// from the header (recordOffsets) and the cursor is past the time-step
// block (next item above 0). Returns false, having done nothing, otherwise:
// the caller skips item by item (and meets the report).
bool skipItemsAtOnce(GrdHeader* header, FileHandle file, int32_t wanted) {
    if (header->nextItem <= 0 || header->nextItem >= wanted || wanted > header->noOfItems) return false;
    const int64_t* at = recordOffsets(header);
    if (at == nullptr) return false;
    rcfSkipDeferred64(file, static_cast<uint64_t>(at[wanted] - at[header->nextItem]));
    header->nextItem = wanted;
    return true;
}

// Positions a file opened for reading at item `wanted` (0-based, above 0)
// of time step t in one move, where the time step is reached by a trusted
// jump: the time comes from the time-step block for the non-equidistant
// type (read first), else it is the step's index. False, having done
// nothing, where that does not hold.
bool jumpToItem(GrdHeader* header, FileHandle file, int32_t t, int32_t wanted, int32_t* status) {
    int64_t step = 0;
    const int64_t* at = recordOffsets(header);
    if (wanted <= 0 || at == nullptr || !trustedJump(header, file, t, &step)) return false;
    file->ownerMark = kSectionDynamic;
    header->timeStepsDone = t;
    header->nextItem = 0;
    if (header->fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS) {
        grdSeekTo(file, step);
        *status = file->error != F_NO_ERROR ? takeError(header, file, __LINE__) : grdReadTimeStepBlock(header, file);
        if (*status == F_NO_ERROR) rcfSkipDeferred64(file, static_cast<uint64_t>(at[wanted]));
    } else {
        grdSeekTo(file, step + timeStepBlockBytes(header) + at[wanted]);
        *status = file->error != F_NO_ERROR ? takeError(header, file, __LINE__) : F_NO_ERROR;
        header->currentTime = grdCallerTime(header, t);
    }
    if (*status == F_NO_ERROR) header->nextItem = wanted;
    return true;
}

// Passes over the next static item without reading its values: the blocks
// of its item record up to and including the 40001 block with its values.
// *found is false when no static item follows (the static part is over).
int32_t skipStaticItem(GrdHeader* header, FileHandle file, bool* found) {
    const int32_t status = staticItemFollows(header, file, found);
    if (status != F_NO_ERROR || !*found) return status;
    *found = false;
    uint32_t identifier = 0;
    while (file->error == F_NO_ERROR) {
        if (rcfQuery(file, &identifier) != RCF_BLOCK || identifier == kTagStaticStart ||
            identifier == kTagDynamicStart) {
            if (file->error == F_NO_ERROR) return report(header, file, F_ERR_SKIP, __LINE__);
            break;
        }
        rcfBlockSkip(file);
        if (identifier == kTagStaticData && file->error == F_NO_ERROR) {
            *found = true;
            return F_NO_ERROR;
        }
    }
    return takeError(header, file, __LINE__);
}

}  // namespace

extern "C" {

int32_t TOVA_CALL grdFindBlock(FileHandle file, int32_t blockCode) {
    GrdApiTrace trace("grdFindBlock %d", blockCode);
    return trace.done(tova::guarded([&]() -> int32_t {
        const int32_t status = grdCheckFile(file, kModule, __LINE__);
        return status != F_NO_ERROR ? status : findBlock(file, blockCode);
    }));
}

int32_t TOVA_CALL grdFindBlockDynamic(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdFindBlockDynamic");
    return trace.done(tova::guarded([&]() -> int32_t {
        int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        // (A legacy file would use the legacy translator's search; tova has none.)
        status = findBlock(file, kTagDynamicStart);
        if (status == F_NO_ERROR) resetCursor(header);
        return status;
    }));
}

int32_t TOVA_CALL grdFindBlockStatic(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdFindBlockStatic");
    return trace.done(tova::guarded([&]() -> int32_t {
        int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (file->ownerMark >= kSectionStatic) status = findBlock(file, kTagStaticStart);
        if (status != F_NO_ERROR) return status;
        resetCursor(header);
        // The encoding keys of a compressed file are its first static items,
        // one per key present: pass over them.
        if (header->fileCompressed != 0) {
            const int32_t keys = (header->keyX ? 1 : 0) + (header->keyY ? 1 : 0) + (header->keyZ ? 1 : 0);
            bool found = true;
            for (int32_t k = 0; k < keys && found && status == F_NO_ERROR; ++k)
                status = skipStaticItem(header, file, &found);
        }
        return status;
    }));
}

int32_t TOVA_CALL grdFindItemStatic(HeaderHandle header, FileHandle file, int32_t staticItemNo) {
    GrdApiTrace trace("grdFindItemStatic %d", staticItemNo);
    return trace.done(tova::guarded([&]() -> int32_t {
        int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (staticItemNo < 1) return F_ERR_ITEM_RANGE;
        status = grdFindBlockStatic(header, file);
        if (status != F_NO_ERROR) return status;
        // Passes over the items before it; it must be there itself.
        bool found = true;
        for (int32_t k = 1; k < staticItemNo && status == F_NO_ERROR && found; ++k)
            status = skipStaticItem(header, file, &found);
        if (status == F_NO_ERROR && found) status = staticItemFollows(header, file, &found);
        return status != F_NO_ERROR || !found ? F_ERR_ITEM_RANGE : F_NO_ERROR;
    }));
}

int32_t TOVA_CALL grdFindTimeStep(HeaderHandle header, FileHandle file, int32_t timeStep) {
    // Traced under the name of the item search, as it always has been.
    GrdApiTrace trace("grdFindItemDynamic %d", timeStep);
    return trace.done(tova::guarded([&]() -> int32_t {
        const int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (!timeStepInRange(header, timeStep)) return F_ERR_TIMESTEP_RANGE;
        return gotoTimeStep(header, file, timeStep);
    }));
}

int32_t TOVA_CALL grdFindItemDynamic(HeaderHandle header, FileHandle file, int32_t timeStep, int32_t itemNo) {
    GrdApiTrace trace("grdFindItemDynamic %d %d", timeStep, itemNo);
    return trace.done(tova::guarded([&]() -> int32_t {
        int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (!timeStepInRange(header, timeStep)) return F_ERR_TIMESTEP_RANGE;
        if (itemNo < 1 || itemNo > header->noOfItems) return F_ERR_ITEM_RANGE;
        const int32_t wanted = itemNo - 1;
        const bool inStep = file->ownerMark >= kSectionDynamic && header->timeStepsDone == timeStep;
        if (inStep && header->nextItem == wanted) return F_NO_ERROR;
        // Within the right time step and before the item: skip forward only.
        if (!(inStep && header->nextItem < wanted)) {
            if (jumpToItem(header, file, timeStep, wanted, &status)) return status;
            status = gotoTimeStep(header, file, timeStep);
        }
        while (status == F_NO_ERROR && header->nextItem != wanted) {
            if (skipItemsAtOnce(header, file, wanted)) break;
            const int32_t before = header->nextItem;
            status = grdSkipItem(header, file);
            // The item-varying file types do not move the cursor on a skip.
            if (status == F_NO_ERROR && header->nextItem == before)
                status = report(header, file, F_ERR_DATA_TYPE, __LINE__);
        }
        return status;
    }));
}

}  // extern "C"
