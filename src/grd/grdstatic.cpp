// Gridded data-file layer, module grdstatic: static items. A static item is
// an item record with its own value array, written between the header and
// the dynamic data:
//   40000 (empty)                  once, before the first static item
//   30005 or 30002, 30006, axis    the item record (header stream writer)
//   40001: one record              the values, data type x element count
// and read back one after another in file order. The file's section state
// (ownerMark) tells where the file stands: 1 after the header, 2 inside the
// static items, 3 inside the dynamic data (no static item may follow).
#include "grd/grdstatic.h"

#include <algorithm>
#include <cstring>
#include <limits>
#include <memory>

#include "common/capi.h"
#include "grd/fileio.h"
#include "grd/grdio.h"
#include "grd/grdstream.h"
#include "qty/qty.h"

namespace {

constexpr const char* kModule = kModGrdStatic;

struct StaticDelete {
    void operator()(GrdStaticItem* item) const noexcept { delete item; }
};
using StaticPtr = std::unique_ptr<GrdStaticItem, StaticDelete>;

float deleteFloatOf(const GrdStaticItem* item) noexcept {
    return item->header != nullptr ? item->header->deleteValFloat : F_DELETE_VALUE_FLOAT;
}
double deleteDoubleOf(const GrdStaticItem* item) noexcept {
    return item->header != nullptr ? item->header->deleteValDouble : F_DELETE_VALUE_DOUBLE;
}

// ---- Unit conversion of item data ------------------------------------------

enum class GrdConvert {
    ToStored,  // caller's unit -> stored unit (before writing)
    ToCaller   // stored unit -> caller's unit (after reading)
};

bool dataConverts(const GrdItem* item) noexcept {
    return (item->dataType == RCF_FLOAT || item->dataType == RCF_DOUBLE) && item->itemConvMode >= 1 &&
           item->itemConvMode <= 3;
}

// The unit library's array conversions, by element type.
void qtyArray(int32_t from, int32_t to, float* a, int32_t n, float del) { qtyConvertItemArrayF(from, to, a, n, del); }
void qtyArray(int32_t from, int32_t to, double* a, int32_t n, double del) { qtyConvertItemArrayD(from, to, a, n, del); }
void qtyToUser(int32_t type, int32_t unit, float* a, int32_t n, float del) {
    qtyConvertItemArrayToUserUnitF(type, unit, a, n, del);
}
void qtyToUser(int32_t type, int32_t unit, double* a, int32_t n, double del) {
    qtyConvertItemArrayToUserUnitD(type, unit, a, n, del);
}
void qtyFromUser(int32_t type, int32_t unit, float* a, int32_t n, float del) {
    qtyConvertItemArrayFromUserUnitF(type, unit, a, n, del);
}
void qtyFromUser(int32_t type, int32_t unit, double* a, int32_t n, double del) {
    qtyConvertItemArrayFromUserUnitD(type, unit, a, n, del);
}

// Converts n values: mode 1 the user unit, mode 2 the alternative unit, mode
// 3 the first unit of the item type's sequence, each against the stored unit.
template <class T>
void convertPiece(const GrdItem* item, T* a, int32_t n, T del, GrdConvert dir) noexcept {
    const bool toStored = dir == GrdConvert::ToStored;
    int32_t other = 0;
    switch (item->itemConvMode) {
        case 1:
            if (toStored) qtyFromUser(item->itemType, item->unit, a, n, del);
            else qtyToUser(item->itemType, item->unit, a, n, del);
            return;
        case 2:
            other = item->itemConvUnit;
            break;
        case 3:
            other = grdBaseUnit(item->itemType);
            break;
        default:
            return;
    }
    if (toStored) qtyArray(other, item->unit, a, n, del);
    else qtyArray(item->unit, other, a, n, del);
}

// The unit library takes int32 counts: longer arrays go in pieces.
template <class T>
void convertAll(const GrdItem* item, T* data, int64_t count, T del, GrdConvert dir) noexcept {
    constexpr int64_t kPiece = std::numeric_limits<int32_t>::max();
    for (int64_t done = 0; done < count;) {
        const auto n = static_cast<int32_t>(std::min(count - done, kPiece));
        convertPiece(item, data + done, n, del, dir);
        done += n;
    }
}

// Converts count values of the item's data type in place by its item unit
// conversion mode, with the delete values of its linked header (or the
// defaults). Other data types are left alone.
void convertData(const GrdStaticItem* item, void* data, int64_t count, GrdConvert dir) noexcept {
    if (data == nullptr || count <= 0 || !dataConverts(item)) return;
    if (item->dataType == RCF_FLOAT) convertAll(item, static_cast<float*>(data), count, deleteFloatOf(item), dir);
    else convertAll(item, static_cast<double*>(data), count, deleteDoubleOf(item), dir);
}

// ---- Reading -------------------------------------------------------------------

// Takes the file's pending error: a failure code is returned as it is, end of
// file (or nothing pending) gives fallback.
int32_t takeFailure(FileHandle file, int32_t fallback) noexcept {
    const int32_t error = rcfGetError(file);
    return error > F_EOF ? error : fallback;
}

// Clears a pending end of file left by a look-ahead that found nothing more,
// so that the file stays usable (a file open for editing may be written on).
void clearEndOfFile(FileHandle file) noexcept {
    if (file->error == F_EOF) file->error = F_NO_ERROR;
}

// The next block's identifier, or 0 when the next record is no block start
// (or the file ends there).
uint32_t nextBlockTag(FileHandle file) noexcept {
    uint32_t id = 0;
    return rcfQuery(file, &id) == RCF_BLOCK ? id : 0;
}

// Reads the 40001 block that follows an item record into the item. The value
// record must have the item's data type and exactly its element count
// (computed from its axis in 64 bits); both are checked against the record
// header before anything is allocated, and the record layer checks that the
// file can supply the bytes.
int32_t readValues(GrdStaticItem* item, FileHandle file) {
    auto fail = [&](int32_t code, int32_t line) { return grdReportError(nullptr, file, 0, code, kModule, line); };
    if (nextBlockTag(file) != kTagStaticData) return fail(takeFailure(file, F_ERR_SKIP), __LINE__);
    const int32_t width = grdSimpleTypeSize(item->dataType);
    const int64_t elements = grdItemFullElements(item);
    if (width == 0 || elements < 0) return fail(F_ERR_VALUE, __LINE__);
    rcfSkip(file);  // the block start

    uint32_t count = 0;
    const int32_t type = rcfQuery(file, &count);
    if (type >= 1) {
        if (type != item->dataType) return fail(F_ERR_TYPE, __LINE__);
        if (static_cast<int64_t>(count) != elements) return fail(F_ERR_SIZE, __LINE__);
        if (count == 0) {
            rcfSkip(file);
        } else {
            int32_t gotType = 0;
            uint32_t gotCount = 0;
            void* data = rcfLrecReadAlloc(file, &gotType, &gotCount);
            if (data == nullptr) return fail(takeFailure(file, F_ERR_READ), __LINE__);
            item->values.reset(static_cast<unsigned char*>(data));  // malloc'd: freed with free
            item->valueBytes = elements * width;
        }
    } else if (type == RCF_TERMINATOR) {
        if (elements != 0) return fail(F_ERR_SIZE, __LINE__);
    } else {
        return fail(takeFailure(file, F_ERR_SKIP), __LINE__);
    }
    if (rcfQuery(file, &count) != RCF_TERMINATOR) return fail(takeFailure(file, F_ERR_SKIP), __LINE__);
    rcfSkip(file);
    const int32_t error = takeFailure(file, F_NO_ERROR);
    return error != F_NO_ERROR ? fail(error, __LINE__) : F_NO_ERROR;
}

// grdStaticRead without its trace: the next static item, or null (status 0
// at the end of the static items).
GrdStaticItem* readStatic(FileHandle file, int32_t& status) {
    // A legacy file would be handed to the legacy translator here; none ships.
    status = grdCheckFile(file, kModule, __LINE__);
    if (status != F_NO_ERROR || file->ownerMark > kSectionStatic) return nullptr;
    if (file->ownerMark < kSectionStatic && nextBlockTag(file) == kTagStaticStart) {
        status = FSkipLogicalBlock(file);
        if (status != F_NO_ERROR) return nullptr;
        file->ownerMark = kSectionStatic;
    }
    const uint32_t tag = nextBlockTag(file);
    if (tag == kTagDynamicStart) {
        // The static part is over and the dynamic data begins: the file now
        // stands inside it (as after positioning there), so that no static
        // item can be written over it.
        status = FSkipLogicalBlock(file);
        if (status == F_NO_ERROR) file->ownerMark = kSectionDynamic;
        return nullptr;
    }
    if (tag != kTagItem && tag != kTagItemText) {
        // The static part is over (end of file or anything else).
        status = takeFailure(file, F_NO_ERROR);
        if (status != F_NO_ERROR) grdReportError(nullptr, file, 0, status, kModule, __LINE__);
        return nullptr;
    }
    StaticPtr item(grdNew<GrdStaticItem>());
    if (!item) {
        status = grdReportError(nullptr, file, 0, F_ERR_MEMORY, kModule, __LINE__);
        return nullptr;
    }
    grdItemInit(item.get(), F_DELETE_VALUE_FLOAT);
    item->isStatic = 1;
    status = grdReadItemRecord(nullptr, item.get(), file);
    if (status == F_NO_ERROR) status = readValues(item.get(), file);
    return status == F_NO_ERROR ? item.release() : nullptr;
}

// ---- Writing -------------------------------------------------------------------

bool writableAxis(int32_t axisType) noexcept {
    return axisType != 0 && grdAxisFamily(axisType) != GrdAxisFamily::TimeVarying;
}

int32_t writeStatic(ItemHandle handle, FileHandle file, const void* values) {
    // A legacy file would be handed to the legacy translator here; none ships.
    int32_t status = grdCheckVectorFile(handle, file, kModule, __LINE__);
    if (status != F_NO_ERROR) return status;
    GrdStaticItem* item = grdAsStatic(handle);
    HeaderHandle header = item != nullptr && item->header != nullptr ? item->header : handle->owner;
    auto fail = [&](int32_t code, int32_t line) { return grdReportError(header, file, 0, code, kModule, line); };
    if (item == nullptr) return fail(F_ERR_ARGUMENT, __LINE__);  // an item of a header, not a static item
    if (file->ownerMark >= kSectionDynamic) return fail(F_ERR_ARGUMENT, __LINE__);  // after dynamic data

    // Refusals come before anything is written: a refused item leaves the file as it was.
    const int32_t width = grdSimpleTypeSize(item->dataType);
    const int64_t elements = grdItemFullElements(item);
    if (!writableAxis(item->axisType) || width == 0 || elements < 0 ||
        elements > static_cast<int64_t>(std::numeric_limits<uint32_t>::max() / static_cast<uint32_t>(width)))
        return fail(F_ERR_VALUE, __LINE__);
    if (values == nullptr && elements > 0) return fail(F_ERR_ARGUMENT, __LINE__);

    // Unit conversion on a private copy: the caller's array is never changed.
    const void* data = values;
    GrdArray<unsigned char> copy;
    if (elements > 0 && dataConverts(item)) {
        copy = grdAllocArray<unsigned char>(elements * width);
        if (!copy) return fail(F_ERR_MEMORY, __LINE__);
        std::memcpy(copy.get(), values, static_cast<size_t>(elements * width));
        convertData(item, copy.get(), elements, GrdConvert::ToStored);
        data = copy.get();
    }

    clearEndOfFile(file);  // a look-ahead that met the end
    if (file->ownerMark < kSectionStatic) {
        status = grdCheckWriteLB(header, kTagStaticStart, nullptr, file, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        file->ownerMark = kSectionStatic;
    }
    status = grdWriteItemRecord(header, item, file);
    if (status != F_NO_ERROR) return status;

    // The values go out from the caller's (or the converted) array without a further copy.
    LrecNode* node = nullptr;
    if (elements > 0) {
        node = rcfLrecNodeNew(item->dataType, static_cast<uint32_t>(elements), data, 0, nullptr);
        if (node == nullptr) return fail(F_ERR_MEMORY, __LINE__);
    }
    status = grdCheckWriteLB(header, kTagStaticData, node, file, kModule, __LINE__);
    rcfLrecListFree(&node);
    return status;
}

}  // namespace

GrdStaticItem* grdAsStatic(ItemHandle item) noexcept { return dynamic_cast<GrdStaticItem*>(item); }

// ---- Exported interface ----------------------------------------------------------------

extern "C" {

int32_t TOVA_CALL grdStaticCreate(ItemHandle* staticItem) {
    GrdApiTrace trace("grdStaticCreate");
    if (staticItem == nullptr) return trace.done(grdReportError(nullptr, nullptr, 0, F_ERR_ARGUMENT, kModule, __LINE__));
    *staticItem = nullptr;
    GrdStaticItem* item = grdNew<GrdStaticItem>();
    if (item == nullptr) return trace.done(grdReportError(nullptr, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__));
    grdItemInit(item, F_DELETE_VALUE_FLOAT);
    item->isStatic = 1;
    *staticItem = item;
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdStaticDestroy(ItemHandle* staticItem) {
    GrdApiTrace trace("grdStaticDestroy");
    const ItemHandle handle = staticItem != nullptr ? *staticItem : nullptr;
    int32_t status = grdCheckVector(handle, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    GrdStaticItem* item = grdAsStatic(handle);
    // An item of a header belongs to its header: refused, never freed here.
    if (item == nullptr) return trace.done(grdReportError(handle->owner, nullptr, 0, F_ERR_ARGUMENT, kModule, __LINE__));
    delete item;
    *staticItem = nullptr;
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdStaticSetHeader(HeaderHandle header, ItemHandle staticItem) {
    GrdApiTrace trace("grdStaticSetHeader");
    int32_t status = grdCheckHeader(header, kModule, __LINE__);
    if (status == F_NO_ERROR) status = grdCheckVector(staticItem, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    GrdStaticItem* item = grdAsStatic(staticItem);
    if (item == nullptr) return trace.done(grdReportError(header, nullptr, 0, F_ERR_ARGUMENT, kModule, __LINE__));
    if (item->header == nullptr) item->header = header;  // the first link stays
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdStaticWrite(ItemHandle staticItem, FileHandle file, const void* values) {
    GrdApiTrace trace("grdStaticWrite");
    return trace.done(tova::guarded([&] { return writeStatic(staticItem, file, values); }));
}

ItemHandle TOVA_CALL grdStaticRead(FileHandle file, int32_t* status) {
    GrdApiTrace trace("grdStaticRead");
    int32_t code = F_NO_ERROR;
    GrdStaticItem* item = nullptr;
    code = tova::guarded([&] {
        int32_t s = F_NO_ERROR;
        item = readStatic(file, s);
        return s;
    });
    if (file != nullptr) clearEndOfFile(file);
    if (status != nullptr) *status = code;
    trace.done(code);
    return item;
}

int32_t TOVA_CALL grdStaticGetData(ItemHandle staticItem, void* buffer) {
    GrdApiTrace trace("grdStaticGetData");
    const int32_t status = grdCheckVector(staticItem, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    GrdStaticItem* item = grdAsStatic(staticItem);
    HeaderHandle header = item != nullptr && item->header != nullptr ? item->header : staticItem->owner;
    if (item == nullptr) return trace.done(grdReportError(header, nullptr, 0, F_ERR_ARGUMENT, kModule, __LINE__));
    if (buffer == nullptr) return trace.done(grdReportError(header, nullptr, 0, F_ERR_VALUE, kModule, __LINE__));
    // The used bytes of the item as its axis now stands, never more than it holds.
    const int32_t width = grdSimpleTypeSize(item->dataType);
    const int64_t elements = std::max<int64_t>(grdItemUsedElementCount(item), 0);
    const int64_t bytes = width == 0 || elements > item->valueBytes / width ? item->valueBytes : elements * width;
    if (bytes > 0) std::memcpy(buffer, item->values.get(), static_cast<size_t>(bytes));
    if (width > 0) convertData(item, buffer, bytes / width, GrdConvert::ToCaller);
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdStaticSkip(FileHandle file) {
    GrdApiTrace trace("grdStaticSkip");
    int32_t status = F_NO_ERROR;
    ItemHandle item = grdStaticRead(file, &status);
    if (item != nullptr) grdStaticDestroy(&item);
    return trace.done(status);
}

}  // extern "C"
