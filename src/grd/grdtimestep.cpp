// Gridded data-file layer, module grdtimestep: the dynamic time-step data.
// Every write, read or skip concerns the item under the header's cursor
// (next item, time steps done) and advances it. A time step is one 50001
// block (holding the time for the non-equidistant file types) followed by
// one record per item; compressed items store only the encoding keys'
// elements. This is the hot path of the library: with no unit conversion
// and no compression the caller's array goes to and from the record layer
// directly, without a copy.
#include <algorithm>
#include <climits>
#include <cmath>
#include <cstring>
#include <optional>

#include "common/capi.h"
#include "grd/fileio.h"
#include "grd/grddynamic.h"
#include "grd/grdio.h"
#include "grd/grdplugin.h"
#include "grd/grdstream.h"
#include "qty/qty.h"

namespace {

constexpr const char* kModule = kModGrdTimeStep;

// File-type masks of the cursor checks; the valid file types are single bits.
constexpr int32_t kMaskReadWrite = F_EQTIME_FIXEDSPACE_ALLITEMS | F_NEQTIME_FIXEDSPACE_ALLITEMS;  // 5
constexpr int32_t kMaskSkipItem = 31;
constexpr int32_t kMaskSkipTimeStep = 7;

bool fileTypeIn(int32_t fileType, int32_t mask) {
    switch (fileType) {
        case F_EQTIME_FIXEDSPACE_ALLITEMS:
        case F_EQTIME_TVARSPACE_ALLITEMS:
        case F_NEQTIME_FIXEDSPACE_ALLITEMS:
        case F_NEQTIME_FIXEDSPACE_VARITEMS:
        case F_NEQTIME_TVARSPACE_VARITEMS:
            return (fileType & mask) != 0;
        default:
            return false;
    }
}

// File types whose time-step block holds the time.
bool timeInBlock(int32_t fileType) {
    return fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS || fileType == F_NEQTIME_FIXEDSPACE_VARITEMS ||
           fileType == F_NEQTIME_TVARSPACE_VARITEMS;
}

// File types with time-varying space: each item's values follow a record of
// its coordinates.
bool spaceVaries(int32_t fileType) {
    return fileType == F_EQTIME_TVARSPACE_ALLITEMS || fileType == F_NEQTIME_TVARSPACE_VARITEMS;
}

int32_t report(HeaderHandle header, FileHandle file, int32_t code, int32_t line) {
    return grdReportError(header, file, 0, code, kModule, line);
}

// The item under the cursor and its counts, once the cursor checks passed.
struct Cursor {
    GrdItem* item = nullptr;
    int64_t elements = 0;  // what the caller's array holds
    int64_t used = 0;      // what the item's record holds (the key's elements when compressed)
    uint32_t size = 0;     // bytes per element
    bool compressed() const { return used != elements; }
};

// The checks that every write, read and skip begins with.
int32_t checkCursor(HeaderHandle header, FileHandle file, int32_t mask, Cursor& c, int32_t line) {
    const int32_t status = grdCheckHeaderFile(header, file, kModule, line);
    if (status != F_NO_ERROR) return status;
    if (!fileTypeIn(header->fileType, mask)) return report(header, file, F_ERR_DATA_TYPE, line);
    if (header->nextItem < 0 || header->nextItem >= header->noOfItems || !header->items)
        return report(header, file, F_ERR_ITEMNO, line);
    c.item = &header->items[header->nextItem];
    c.elements = grdItemElementCount(c.item);
    c.used = grdItemUsedElementCount(c.item);
    if (c.elements <= 0 || c.used <= 0) return report(header, file, F_ERR_VALUE, line);
    c.size = static_cast<uint32_t>(grdSimpleTypeSize(c.item->dataType));
    if (c.size == 0) return report(header, file, F_ERR_DATA_TYPE, line);
    // One record holds at most 2^32 - 1 bytes (a time-varying item also its
    // three float coordinates per element).
    // (A product, not a division: this runs on every call.)
    const uint64_t perElement = spaceVaries(header->fileType) ? 12 : c.size;
    const int64_t larger = c.elements > c.used ? c.elements : c.used;
    if (larger > static_cast<int64_t>(UINT32_MAX) || static_cast<uint64_t>(larger) * perElement > UINT32_MAX)
        return report(header, file, F_ERR_VALUE, line);
    return F_NO_ERROR;
}

// Raises the time axis's count of time steps to the steps done; it never falls.
void raiseTimeSteps(GrdHeader* header) {
    if (GrdTimeValues* v = grdTimeAxisValues(header)) v->timeSteps = std::max(v->timeSteps, header->timeStepsDone);
}

void advanceCursor(GrdHeader* header) {
    if (++header->nextItem < header->noOfItems) return;
    header->nextItem = 0;
    if (header->timeStepsDone < INT32_MAX) ++header->timeStepsDone;
    raiseTimeSteps(header);
}

// Writes the block that starts the dynamic data unless the file is already
// inside it, and remembers where the data begin.
int32_t startDynamic(HeaderHandle header, FileHandle file, int32_t line) {
    if (file->ownerMark >= kSectionDynamic) return F_NO_ERROR;
    const int32_t status = grdCheckWriteLB(header, kTagDynamicStart, nullptr, file, kModule, line);
    if (status != F_NO_ERROR) return status;
    file->ownerMark = kSectionDynamic;
    file->dynamicStart = rcfTell64(file);
    return F_NO_ERROR;
}

// The block that opens a time step: empty for the equidistant file types,
// the time as one double for the others.
int32_t writeTimeStepBlock(GrdHeader* header, FileHandle file, double time) {
    if (timeInBlock(header->fileType)) {
        if (header->largestTime == F_DELETE_VALUE_DOUBLE || time > header->largestTime) header->largestTime = time;
        LrecNode node{RCF_DOUBLE, 1, 0, &time, nullptr};
        return grdCheckWriteLB(header, kTagTimeStep, &node, file, kModule, __LINE__);
    }
    if (header->fileType == F_EQTIME_FIXEDSPACE_ALLITEMS || header->fileType == F_EQTIME_TVARSPACE_ALLITEMS)
        return grdCheckWriteLB(header, kTagTimeStep, nullptr, file, kModule, __LINE__);
    return report(header, file, F_ERR_DATA_TYPE, __LINE__);
}

}  // namespace

// ---- Time-step blocks read (shared with positioning) ------------------------------------------

double grdCallerTime(const GrdHeader* header, double time) noexcept {
    if (header->modifyTimes != 0) {
        if (header->timeAxis.type == F_TM_NEQ_AXIS) time -= header->timeAxis.time.start;
        if (header->timeAxis.type == F_CAL_NEQ_AXIS) time -= header->timeAxis.calendar.start;
    }
    return time;
}

int32_t grdReadTimeStepBlock(GrdHeader* header, FileHandle file) {
    header->currentTime = header->deleteValDouble;
    GrdRecordList block;
    uint16_t identifier = 0;
    const int32_t status = grdCheckReadLB(header, file, &block.list, &identifier, kModule, __LINE__);
    if (status != F_NO_ERROR) return status;
    if (identifier != kTagTimeStep) return report(header, file, F_ERR_VALUE, __LINE__);
    double time = 0.0;
    if (timeInBlock(header->fileType)) {
        const LrecNode* n = block.list;
        if (n == nullptr || n->next != nullptr || n->type != RCF_DOUBLE || n->count != 1 || n->data == nullptr)
            return report(header, file, F_ERR_VALUE, __LINE__);
        std::memcpy(&time, n->data, sizeof(time));
    } else if (header->fileType == F_EQTIME_FIXEDSPACE_ALLITEMS || header->fileType == F_EQTIME_TVARSPACE_ALLITEMS) {
        if (block.list != nullptr) return report(header, file, F_ERR_VALUE, __LINE__);
        time = header->timeStepsDone;
    } else {
        return report(header, file, F_ERR_DATA_TYPE, __LINE__);
    }
    header->currentTime = grdCallerTime(header, time);
    return F_NO_ERROR;
}

namespace {

// ---- Compression ----------------------------------------------------------------------------

// Grid position of the i-th stored element of a compressed item: z * (nx * ny)
// + y * nx + x from the encoding keys (an absent key counts 0); -1 when it
// falls outside the item's full array (a damaged key never reaches memory
// outside the caller's array).
struct KeyIndex {
    const int32_t* x;
    const int32_t* y;
    const int32_t* z;
    int64_t nx;
    int64_t nxy;
    int64_t full;

    KeyIndex(const GrdHeader* h, const GrdItem* item, int64_t fullCount)
        : x(h->keyX.get()), y(h->keyY.get()), z(h->keyZ.get()), nx(item->size[0]),
          nxy(static_cast<int64_t>(item->size[0]) * item->size[1]), full(fullCount) {}

    int64_t operator()(int64_t i) const {
        const int64_t k = (z ? z[i] * nxy : 0) + (y ? y[i] * nx : 0) + (x ? x[i] : 0);
        return k >= 0 && k < full ? k : -1;
    }
};

// Elements are moved as words of their own width (the record of a compressed
// item holds elements of the item's data type).
template <class W>
bool gatherWords(const void* fullArray, void* packed, int64_t n, const KeyIndex& key) {
    const W* src = static_cast<const W*>(fullArray);
    W* dst = static_cast<W*>(packed);
    bool ok = true;
    for (int64_t i = 0; i < n; ++i) {
        const int64_t k = key(i);
        ok = ok && k >= 0;
        dst[i] = k >= 0 ? src[k] : W{};
    }
    return ok;
}

template <class W>
bool scatterWords(const void* packed, void* fullArray, int64_t n, W fill, const KeyIndex& key) {
    const W* src = static_cast<const W*>(packed);
    W* dst = static_cast<W*>(fullArray);
    std::fill(dst, dst + key.full, fill);
    bool ok = true;
    for (int64_t i = 0; i < n; ++i) {
        const int64_t k = key(i);
        if (k >= 0) dst[k] = src[i];
        ok = ok && k >= 0;
    }
    return ok;
}

bool gather(const GrdHeader* h, const Cursor& c, const void* fullArray, void* packed) {
    const KeyIndex key(h, c.item, c.elements);
    switch (c.size) {
        case 1: return gatherWords<uint8_t>(fullArray, packed, c.used, key);
        case 2: return gatherWords<uint16_t>(fullArray, packed, c.used, key);
        case 4: return gatherWords<uint32_t>(fullArray, packed, c.used, key);
        default: return gatherWords<uint64_t>(fullArray, packed, c.used, key);
    }
}

template <class T, class W>
W bitsOf(T value) {
    static_assert(sizeof(T) == sizeof(W));
    W w;
    std::memcpy(&w, &value, sizeof(w));
    return w;
}

// Positions outside the key are filled with the delete value of the item's
// data type (the float delete value for float items; the 16-bit types have
// no delete value and get 0).
bool scatter(const GrdHeader* h, const Cursor& c, const void* packed, void* fullArray) {
    const KeyIndex key(h, c.item, c.elements);
    switch (c.item->dataType) {
        case RCF_FLOAT: return scatterWords(packed, fullArray, c.used, bitsOf<float, uint32_t>(h->deleteValFloat), key);
        case RCF_DOUBLE:
            return scatterWords(packed, fullArray, c.used, bitsOf<double, uint64_t>(h->deleteValDouble), key);
        case RCF_BYTE: return scatterWords(packed, fullArray, c.used, bitsOf<char, uint8_t>(h->deleteValByte), key);
        case RCF_INT4: return scatterWords(packed, fullArray, c.used, bitsOf<int32_t, uint32_t>(h->deleteValInt), key);
        case RCF_UINT4: return scatterWords(packed, fullArray, c.used, h->deleteValUnsignedInt, key);
        default: return scatterWords<uint16_t>(packed, fullArray, c.used, 0, key);
    }
}

// ---- Write, read, skip ----------------------------------------------------------------------

int32_t writeItem(GrdHeader* header, FileHandle file, double time, const void* data) {
    if (file != nullptr && file->error == F_EOF) file->error = 0;
    // (Legacy files would go to the legacy translator here; tova has none.)
    Cursor c;
    int32_t status = checkCursor(header, file, kMaskReadWrite, c, __LINE__);
    if (status != F_NO_ERROR) return status;
    if (file->readOnly != 0) return report(header, file, F_ERR_READONLY, __LINE__);
    if (data == nullptr) return report(header, file, F_ERR_ARGUMENT, __LINE__);

    // The values as stored: the caller's array itself, or a private copy
    // when they are gathered or converted (the caller's array never changes).
    const void* stored = data;
    GrdArray<unsigned char> copy;
    const bool converts = grdItemDataConverts(c.item);
    if (c.compressed() || converts) {
        copy = grdAllocArray<unsigned char>(c.used * c.size);
        if (!copy) return report(header, file, F_ERR_MEMORY, __LINE__);
        if (c.compressed()) {
            if (!gather(header, c, data, copy.get())) return report(header, file, F_ERR_VALUE, __LINE__);
        } else {
            std::memcpy(copy.get(), data, static_cast<size_t>(c.used * c.size));
        }
        grdConvertItemData(header, c.item, copy.get(), c.used, true);
        stored = copy.get();
    }

    status = startDynamic(header, file, __LINE__);
    if (status != F_NO_ERROR) return status;
    if (header->nextItem == 0) {
        if (header->timeStepsDone == 0) {
            // A non-equidistant axis starts at the first time written.
            if (header->timeAxis.type == F_TM_NEQ_AXIS) header->timeAxis.time.start = time;
            if (header->timeAxis.type == F_CAL_NEQ_AXIS) header->timeAxis.calendar.start = time;
        }
        status = writeTimeStepBlock(header, file, time);
        if (status != F_NO_ERROR) return status;
    }
    // The extremes of a large item are found beside the record's write.
    std::optional<GrdExtremesBeside> extremes;
    if (c.used * c.size >= GrdExtremesBeside::kMinBytes)
        grdStartGlobalStatistics(header, c.item, stored, c.used, extremes);
    status = grdCheckWriteLR(header, c.item->dataType, static_cast<uint32_t>(c.used), stored, file, kModule,
                             __LINE__);
    if (status != F_NO_ERROR) return status;
    // The record is on disk: the cursor moves on even if the statistics
    // refuse the header's statistics type.
    const int32_t stats = grdCalcStatistics(header, header->nextItem + 1, stored, extremes ? &*extremes : nullptr);
    advanceCursor(header);
    return stats;
}

// Reads the item's record into the caller's buffer, checking its count
// against the item's before anything is read; a compressed item is spread
// over the full array.
int32_t readValues(GrdHeader* header, FileHandle file, const Cursor& c, void* data) {
    uint32_t count = 0;
    const int32_t type = rcfQuery(file, &count);
    if (type >= 1 && count != static_cast<uint64_t>(c.used)) return report(header, file, F_ERR_SIZE, __LINE__);
    // A mark of no known kind where the record should be, with the stream
    // sound: no values follow (the read would give back nothing as success).
    if (type == 0 && rcfPeekError(file) == 0) return report(header, file, F_ERR_TYPE, __LINE__);
    const auto used = static_cast<uint32_t>(c.used);
    int32_t status = F_NO_ERROR;
    if (!c.compressed()) {
        status = grdCheckReadLR(header, c.item->dataType, used, data, file, kModule, __LINE__);
    } else {
        // The packed values need room of their own: only what the file holds.
        if (!rcfFits(file, 5 + static_cast<uint64_t>(c.used) * c.size))
            return report(header, file, F_ERR_READ, __LINE__);
        GrdArray<unsigned char> packed = grdAllocArray<unsigned char>(c.used * c.size);
        if (!packed) return report(header, file, F_ERR_MEMORY, __LINE__);
        status = grdCheckReadLR(header, c.item->dataType, used, packed.get(), file, kModule, __LINE__);
        if (status == F_NO_ERROR && !scatter(header, c, packed.get(), data))
            status = report(header, file, F_ERR_VALUE, __LINE__);
    }
    if (status == F_NO_ERROR) grdConvertItemData(header, c.item, data, c.elements, false);
    return status;
}

// Cursor checks, and positioning at the dynamic data when the file is not
// yet inside it (which puts the cursor at the first item of time step 0).
int32_t prepareDynamicAccess(GrdHeader* header, FileHandle file, int32_t mask, Cursor& c, int32_t line) {
    int32_t status = checkCursor(header, file, mask, c, line);
    if (status != F_NO_ERROR || file->ownerMark >= kSectionDynamic) return status;
    status = grdFindBlockDynamic(header, file);
    if (status != F_NO_ERROR) return status;
    return checkCursor(header, file, mask, c, line);
}

int32_t readItem(GrdHeader* header, FileHandle file, double* time, void* data) {
    // (Legacy files would be read by the legacy translator here; tova has none.)
    Cursor c;
    int32_t status = prepareDynamicAccess(header, file, kMaskReadWrite, c, __LINE__);
    if (status != F_NO_ERROR) return status;
    if (grdPluginRoutes(header)) {
        // A loaded plug-in delivers the item (reading the file itself).
        status = grdPluginDeliver(header, file, data, true);
        if (status == F_NO_ERROR) grdConvertItemData(header, c.item, data, c.elements, false);
        if (time != nullptr) *time = header->currentTime;
        if (status == F_NO_ERROR) advanceCursor(header);
        return status;
    }
    int64_t stepStart = -1;
    if (header->nextItem == 0) {
        stepStart = rcfTell64(file);
        status = grdReadTimeStepBlock(header, file);
    }
    if (status == F_NO_ERROR) {
        status = data == nullptr ? grdCheckSkipLR(header, file, kModule, __LINE__)
                                 : readValues(header, file, c, data);
        // The cursor stays where it was: so does the file, at the start of
        // the time step, for a retry or a skip.
        if (status != F_NO_ERROR && stepStart >= 0) grdSeekTo(file, stepStart);
    }
    if (time != nullptr) *time = header->currentTime;
    if (status == F_NO_ERROR) advanceCursor(header);
    return status;
}

int32_t skipItem(GrdHeader* header, FileHandle file) {
    Cursor c;
    int32_t status = prepareDynamicAccess(header, file, kMaskSkipItem, c, __LINE__);
    if (status != F_NO_ERROR) return status;
    // A loaded plug-in prepares each new time step (reading the file
    // itself); its items are passed without touching the file.
    if (grdPluginRoutes(header)) {
        status = grdPluginDeliver(header, file, nullptr, false);
        if (status == F_NO_ERROR) advanceCursor(header);
        return status;
    }
    if (header->nextItem == 0) {
        status = grdReadTimeStepBlock(header, file);
        if (status != F_NO_ERROR) return status;
    }
    const auto used = static_cast<uint32_t>(c.used);
    if (spaceVaries(header->fileType)) grdCheckPseudoSkipLR(RCF_FLOAT, 3 * used, file);
    grdCheckPseudoSkipLR(c.item->dataType, used, file);
    // The item-varying file types (8, 16) do not say which item comes next,
    // so their cursor stays.
    if (header->fileType != F_NEQTIME_FIXEDSPACE_VARITEMS && header->fileType != F_NEQTIME_TVARSPACE_VARITEMS)
        advanceCursor(header);
    return F_NO_ERROR;
}

int32_t skipTimeStep(GrdHeader* header, FileHandle file) {
    int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
    if (status != F_NO_ERROR) return status;
    if (!fileTypeIn(header->fileType, kMaskSkipTimeStep)) return report(header, file, F_ERR_DATA_TYPE, __LINE__);
    do {
        status = grdSkipItem(header, file);
    } while (status == F_NO_ERROR && header->nextItem != 0);
    return status;
}

// ---- Rounding -----------------------------------------------------------------------------------

// v rounded to digits significant decimal digits (v finite and not 0).
double roundSignificant(double v, int32_t digits) {
    const double lo = std::pow(10.0, digits - 1);
    const double hi = std::pow(10.0, digits);
    double m = std::fabs(v);
    double s = 1.0;
    double r;
    if (m < lo) {
        while (m < lo) {
            m *= 10.0;
            s *= 10.0;
        }
        r = std::floor(m + 0.5) / s;
    } else if (m > hi) {
        while (m > hi) {
            m /= 10.0;
            s *= 10.0;
        }
        r = std::floor(m + 0.5) * s;
    } else {
        r = std::floor(m + 0.5);
    }
    return v < 0 ? -r : r;
}

template <class T>
void truncateValues(T* p, int64_t n, T deleteValue, int32_t digits) {
    for (int64_t i = 0; i < n; ++i) {
        const T v = p[i];
        if (v == deleteValue || v == 0 || !std::isfinite(v)) continue;
        p[i] = static_cast<T>(roundSignificant(static_cast<double>(v), digits));
    }
}

// The placeholders trace their name on entry only, as they always have.
int32_t placeholder(const char* name) {
    if (tova::traceApiOn()) DebugEnter(name);
    return 1;
}

}  // namespace

// ---- Shared with positioning and statistics -----------------------------------------------------

bool grdItemDataConverts(const GrdItem* item) noexcept {
    return item->itemConvMode >= 1 && item->itemConvMode <= 3 &&
           (item->dataType == RCF_FLOAT || item->dataType == RCF_DOUBLE);
}

void grdConvertItemData(const GrdHeader* header, const GrdItem* item, void* data, int64_t count,
                        bool toStored) noexcept {
    if (!grdItemDataConverts(item) || data == nullptr) return;
    const int32_t mode = item->itemConvMode;
    const int32_t type = item->itemType;
    const int32_t unit = item->unit;
    // Mode 2 converts between the alternative unit and the stored one, mode 3
    // between the first unit of the quantity type and the stored one.
    const int32_t other = mode == 2 ? item->itemConvUnit : mode == 3 ? grdBaseUnit(type) : 0;
    const int32_t from = toStored ? other : unit;
    const int32_t to = toStored ? unit : other;
    // The unit library counts in 32 bits: longer arrays go in pieces.
    for (int64_t done = 0; done < count;) {
        const auto n = static_cast<int32_t>(std::min<int64_t>(count - done, INT32_MAX));
        if (item->dataType == RCF_FLOAT) {
            float* p = static_cast<float*>(data) + done;
            const float del = header->deleteValFloat;
            if (mode != 1) qtyConvertItemArrayF(from, to, p, n, del);
            else if (toStored) qtyConvertItemArrayFromUserUnitF(type, unit, p, n, del);
            else qtyConvertItemArrayToUserUnitF(type, unit, p, n, del);
        } else {
            double* p = static_cast<double*>(data) + done;
            const double del = header->deleteValDouble;
            if (mode != 1) qtyConvertItemArrayD(from, to, p, n, del);
            else if (toStored) qtyConvertItemArrayFromUserUnitD(type, unit, p, n, del);
            else qtyConvertItemArrayToUserUnitD(type, unit, p, n, del);
        }
        done += n;
    }
}

double grdConvertItemValue(const GrdHeader* header, const GrdItem* item, double value) noexcept {
    const double del = header != nullptr ? header->deleteValDouble : F_DELETE_VALUE_DOUBLE;
    if (!grdItemDataConverts(item) || value == del) return value;
    double out = value;  // the unit library leaves it as it is on failure
    switch (item->itemConvMode) {
        case 1: qtyConvertToUserUnit(item->itemType, item->unit, value, &out); break;
        case 2: qtyConvertUnit(item->unit, value, item->itemConvUnit, &out); break;
        default: qtyConvertUnit(item->unit, value, grdBaseUnit(item->itemType), &out); break;
    }
    return out;
}

// ---- Exported ---------------------------------------------------------------------------------------

extern "C" {

int32_t TOVA_CALL grdWriteStartBlockDynamic(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdWriteStartBlockDynamic");
    return trace.done(tova::guarded([&]() -> int32_t {
        // (A legacy file would answer 0 here; tova has no legacy translator.)
        int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (!fileTypeIn(header->fileType, kMaskReadWrite)) return report(header, file, F_ERR_DATA_TYPE, __LINE__);
        if (file->readOnly != 0) return report(header, file, F_ERR_READONLY, __LINE__);
        if (file->error == F_EOF) file->error = 0;
        status = startDynamic(header, file, __LINE__);
        if (status == F_NO_ERROR) raiseTimeSteps(header);
        return status;
    }));
}

int32_t TOVA_CALL grdWriteItemTimeStep(HeaderHandle header, FileHandle file, double time, const void* data) {
    GrdApiTrace trace("grdWriteItemTimeStep %lf ", time);
    return trace.done(tova::guarded([&]() -> int32_t { return writeItem(header, file, time, data); }));
}

int32_t TOVA_CALL grdReadItemTimeStep(HeaderHandle header, FileHandle file, double* time, void* data) {
    GrdApiTrace trace("grdReadItemTimeStep");
    return trace.done(tova::guarded([&]() -> int32_t { return readItem(header, file, time, data); }));
}

int32_t TOVA_CALL grdSkipItem(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdSkipItem");
    return trace.done(tova::guarded([&]() -> int32_t { return skipItem(header, file); }));
}

int32_t TOVA_CALL grdSkipTimeStep(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdSkipTimeStep");
    return trace.done(tova::guarded([&]() -> int32_t { return skipTimeStep(header, file); }));
}

int32_t TOVA_CALL grdTruncateItemTimeStep(HeaderHandle header, int32_t itemNo, int32_t digits, void* data) {
    GrdApiTrace trace("grdTruncateItemTimeStep %d %d", itemNo, digits);
    // Nothing is checked or reported; what cannot be rounded is left alone.
    const GrdItem* item = grdHeaderItem(header, itemNo);
    if (item == nullptr || data == nullptr) return trace.done(F_NO_ERROR);
    const int64_t n = grdItemUsedElementCount(item);
    if (item->dataType == RCF_FLOAT) truncateValues(static_cast<float*>(data), n, header->deleteValFloat, digits);
    if (item->dataType == RCF_DOUBLE) truncateValues(static_cast<double*>(data), n, header->deleteValDouble, digits);
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdWriteItemTvarTimeStep(HeaderHandle, FileHandle, double, const void*, const void*) {
    return placeholder("grdWriteItemTvarTimeStep");
}

int32_t TOVA_CALL grdReadItemTvarTimeStep(HeaderHandle, FileHandle, double*, void*, void*) {
    return placeholder("grdReadItemTvarTimeStep");
}

int32_t TOVA_CALL grdQueryFreeItemTimeStep(HeaderHandle, FileHandle, int32_t*, int32_t*) {
    return placeholder("grdQueryFreeItemTimeStep");
}

int32_t TOVA_CALL grdQueryFreeItemTvarTimeStep(HeaderHandle, FileHandle, int32_t*, int32_t*) {
    return placeholder("grdQueryFreeItemTvarTimeStep");
}

int32_t TOVA_CALL grdReadFreeItemTimeStep(HeaderHandle, FileHandle, double*, int32_t*, void*) {
    return placeholder("grdReadFreeItemTimeStep");
}

int32_t TOVA_CALL grdReadFreeItemTvarTimeStep(HeaderHandle, FileHandle, double*, int32_t*, void*, void*) {
    return placeholder("grdReadFreeItemTvarTimeStep");
}

int32_t TOVA_CALL grdWriteFreeItemTimeStep(HeaderHandle, FileHandle, double, int32_t, int32_t, const void*) {
    return placeholder("grdWriteFreeItemTimeStep");
}

int32_t TOVA_CALL grdWriteFreeItemTvarTimeStep(HeaderHandle, FileHandle, double, int32_t, int32_t, const void*,
                                               const void*) {
    return placeholder("grdWriteFreeItemTvarTimeStep");
}

}  // extern "C"
