// Gridded data-file layer, module grdio: the process-wide table of user error
// handlers, the status dispatcher and the API trace switch, and the
// file-level attributes of a header (titles, versions, delete values, map
// projection, custom blocks).
//
// The handler table is an array of atomics so that threads working on
// distinct files may report failures while handlers stay untouched; handlers
// are meant to be installed before files are used.
#include "grd/grdio.h"

#include <array>
#include <atomic>
#include <cstring>

#include "grd/grdheader.h"
#include "trace/trace_internal.h"

namespace {

constexpr int kHandlerSlots = 22;
std::array<std::atomic<grdErrorHandler>, kHandlerSlots> g_handlers{};

void clearHandlers() {
    for (auto& slot : g_handlers) slot.store(nullptr, std::memory_order_relaxed);
}

}  // namespace

int32_t grdHandlerSlot(int32_t code) {
    if (code == 1000) return 0;
    if (code >= 2000 && code <= 2020) return code - 2000 + 1;
    return -1;
}

int32_t grdReportError(HeaderHandle header, FileHandle file, int32_t extra, int32_t code, const char* module,
                       int32_t line) {
    const int32_t slot = grdHandlerSlot(code);
    if (slot < 0) return code;
    grdErrorHandler handler = g_handlers[static_cast<size_t>(slot)].load(std::memory_order_acquire);
    if (handler != nullptr) handler(header, file, extra, code, module, line);
    return code;
}

extern "C" {

intptr_t TOVA_CALL grdAddErrorHandler(int32_t code, grdErrorHandler handler) {
    // 2020 has no case here on purpose: its slot can be served but not set.
    if (code == 1000 || (code >= 2000 && code <= 2019)) {
        g_handlers[static_cast<size_t>(grdHandlerSlot(code))].store(handler, std::memory_order_release);
        return reinterpret_cast<intptr_t>(handler);
    }
    return code > 2000 ? code - 2001 : code;
}

intptr_t TOVA_CALL grdAddCommonErrorHandler(grdErrorHandler /*handler*/) {
    // Resets handling to no handlers at all; the argument is not stored.
    clearHandlers();
    return reinterpret_cast<intptr_t>(&g_handlers);
}

void TOVA_CALL grdInitSystem(void) { clearHandlers(); }

const char* TOVA_CALL grdGetStatusText(int32_t status) {
    // One fixed text per code: the code's trace name, then what it means.
    switch (status) {
    case F_NO_ERROR: return "F_NO_ERROR: success";
    case F_EOF: return "F_EOF: end of file met";
    case F_ERR_ARGUMENT: return "F_ERR_ARGUMENT: a required argument is null or of the wrong kind";
    case F_ERR_TIMESTEP_RANGE: return "F_ERR_TIMESTEP_RANGE: time-step index out of range";
    case F_ERR_ITEM_RANGE: return "F_ERR_ITEM_RANGE: no such item or static item";
    case F_ERR_MEMORY: return "F_ERR_MEMORY: memory allocation failed";
    case F_ERR_READ: return "F_ERR_READ: reading from the file failed or no record where one was expected";
    case F_ERR_WRITE: return "F_ERR_WRITE: writing to the file failed";
    case F_ERR_OPEN: return "F_ERR_OPEN: the file could not be opened";
    case F_ERR_CLOSE: return "F_ERR_CLOSE: closing the file failed";
    case F_ERR_FLUSH: return "F_ERR_FLUSH: flushing the file's buffers failed";
    case F_ERR_SEEK: return "F_ERR_SEEK: positioning in the file failed";
    case F_ERR_ITEMNO: return "F_ERR_ITEMNO: item number out of range";
    case F_ERR_ELEMENT: return "F_ERR_ELEMENT: element index out of range";
    case F_ERR_TYPE: return "F_ERR_TYPE: a record or block of the wrong type";
    case F_ERR_VALUE: return "F_ERR_VALUE: a value not valid or not supported here";
    case F_ERR_DATE_FORMAT: return "F_ERR_DATE_FORMAT: the date text could not be parsed";
    case F_ERR_TIME_FORMAT: return "F_ERR_TIME_FORMAT: the time-of-day text could not be parsed";
    case F_ERR_SIZE: return "F_ERR_SIZE: a record or block of the wrong size or count";
    case F_ERR_NOT_RCF: return "F_ERR_NOT_RCF: not a record file";
    case F_ERR_READONLY: return "F_ERR_READONLY: the file is open for reading only";
    case F_ERR_NOT_BLOCK: return "F_ERR_NOT_BLOCK: no block start where a block was expected";
    case F_ERR_APP_TAG: return "F_ERR_APP_TAG: the file's application tag does not match";
    case F_ERR_DATA_TYPE: return "F_ERR_DATA_TYPE: data type or operation not allowed for this file";
    case F_ERR_SKIP: return "F_ERR_SKIP: a skip did not land on a valid record";
    case F_ERR_UNIT: return "F_ERR_UNIT: the unit is not valid for the item's quantity";
    default: return "unknown status";
    }
}

int32_t TOVA_CALL grdDebugOn(int32_t flag) {
    tova::g_traceApi.store(flag, std::memory_order_relaxed);
    return flag;
}

}  // extern "C"

// ---- File-level attributes ---------------------------------------------------
// Titles, application version, data type, delete values, the modify-times
// switch, the map projection and the custom blocks of a header.

namespace {

constexpr const char* kModule = kModGrdIo;

// A getter of one header field: traced, the fallback for a null header.
template <class T, class Fn>
T getField(const char* name, HeaderHandle header, int32_t line, T fallback, Fn fn) {
    return grdTracedGet(name, header, grdCheckHeader, kModule, line, fallback, fn);
}

// An operation on a checked header; fn returns a status.
template <class Fn, class... Args>
int32_t withHeader(HeaderHandle header, int32_t line, Fn fn, const char* format, Args... args) {
    return grdTracedDo(header, grdCheckHeader, kModule, line, fn, format, args...);
}

int32_t setTitle(HeaderHandle header, GrdText GrdHeader::*field, const char* text, int32_t line) {
    return (header->*field).assign(text ? text : "") ? F_NO_ERROR
                                                  : grdReportError(header, nullptr, 0, F_ERR_MEMORY, kModule, line);
}

}  // namespace

extern "C" {

int32_t TOVA_CALL grdGetFileType(HeaderHandle header) {
    return getField("grdGetFileType", header, __LINE__, 0, [](HeaderHandle h) { return h->fileType; });
}

const char* TOVA_CALL grdGetFileTitle(HeaderHandle header) {
    return getField("grdGetFileTitle", header, __LINE__, "", [](HeaderHandle h) { return h->fileTitle.orEmpty(); });
}

int32_t TOVA_CALL grdSetFileTitle(HeaderHandle header, const char* title) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return setTitle(h, &GrdHeader::fileTitle, title, __LINE__); },
        "grdSetFileTitle <%s>", grdTraceText(title));
}

const char* TOVA_CALL grdGetAppTitle(HeaderHandle header) {
    return getField("grdGetAppTitle", header, __LINE__, "", [](HeaderHandle h) { return h->appTitle.orEmpty(); });
}

int32_t TOVA_CALL grdSetAppTitle(HeaderHandle header, const char* title) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return setTitle(h, &GrdHeader::appTitle, title, __LINE__); },
        "grdSetAppTitle <%s>", grdTraceText(title));
}

int32_t TOVA_CALL grdGetAppVersionNo(HeaderHandle header) {
    return getField("grdGetAppVersionNo", header, __LINE__, -1, [](HeaderHandle h) { return h->appVersionNo; });
}

int32_t TOVA_CALL grdSetAppVersionNo(HeaderHandle header, int32_t versionNo) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->appVersionNo = versionNo, F_NO_ERROR; },
        "grdSetAppVersionNo %d", versionNo);
}

int32_t TOVA_CALL grdGetDataType(HeaderHandle header) {
    return getField("grdGetDataType", header, __LINE__, 0, [](HeaderHandle h) { return h->dataType; });
}

int32_t TOVA_CALL grdSetDataType(HeaderHandle header, int32_t dataType) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->dataType = dataType, F_NO_ERROR; }, "grdSetDataType %d",
        dataType);
}

int32_t TOVA_CALL grdGetItemStatsType(HeaderHandle header) {
    return getField("grdGetItemStatsType", header, __LINE__, 0, [](HeaderHandle h) { return h->statsType; });
}

float TOVA_CALL grdGetDeleteValFloat(HeaderHandle header) {
    return getField("grdGetDeleteValFloat", header, __LINE__, 0.0f, [](HeaderHandle h) { return h->deleteValFloat; });
}

double TOVA_CALL grdGetDeleteValDouble(HeaderHandle header) {
    return getField("grdGetDeleteValDouble", header, __LINE__, 0.0,
                    [](HeaderHandle h) { return h->deleteValDouble; });
}

char TOVA_CALL grdGetDeleteValByte(HeaderHandle header) {
    return getField("grdGetDeleteValByte", header, __LINE__, '\0', [](HeaderHandle h) { return h->deleteValByte; });
}

int32_t TOVA_CALL grdGetDeleteValInt(HeaderHandle header) {
    return getField("grdGetDeleteValInt", header, __LINE__, 0, [](HeaderHandle h) { return h->deleteValInt; });
}

uint32_t TOVA_CALL grdGetDeleteValUnsignedInt(HeaderHandle header) {
    return getField("grdGetDeleteValUnsignedInt", header, __LINE__, 0u,
                    [](HeaderHandle h) { return h->deleteValUnsignedInt; });
}

int32_t TOVA_CALL grdSetDeleteValFloat(HeaderHandle header, float value) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->deleteValFloat = value, F_NO_ERROR; },
        "grdSetDeleteValFloat %g", static_cast<double>(value));
}

int32_t TOVA_CALL grdSetDeleteValDouble(HeaderHandle header, double value) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->deleteValDouble = value, F_NO_ERROR; },
        "grdSetDeleteValDouble %g", value);
}

int32_t TOVA_CALL grdSetDeleteValByte(HeaderHandle header, char value) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->deleteValByte = value, F_NO_ERROR; },
        "grdSetDeleteValByte %d", static_cast<int>(value));
}

int32_t TOVA_CALL grdSetDeleteValInt(HeaderHandle header, int32_t value) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->deleteValInt = value, F_NO_ERROR; },
        "grdSetDeleteValInt %d", value);
}

int32_t TOVA_CALL grdSetDeleteValUnsignedInt(HeaderHandle header, uint32_t value) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->deleteValUnsignedInt = value, F_NO_ERROR; },
        "grdSetDeleteValUnsignedInt %u", value);
}

int32_t TOVA_CALL grdParamModifyTimes(HeaderHandle header, int32_t flag) {
    return withHeader(
        header, __LINE__, [&](HeaderHandle h) { return h->modifyTimes = flag, F_NO_ERROR; },
        "grdParamModifyTimes %d", flag);
}

// ---- Map projection ----------------------------------------------------------

int32_t TOVA_CALL grdGetGeoInfoType(HeaderHandle header) {
    return getField("grdGetGeoInfoType", header, __LINE__, 0, [](HeaderHandle h) { return h->geoInfoType; });
}

int32_t TOVA_CALL grdSetGeoInfoUTMProj(HeaderHandle header, const char* projection, double longitude,
                                       double latitude, double orientation) {
    return withHeader(
        header, __LINE__,
        [&](HeaderHandle h) {
            h->geoInfoType = F_UTM_PROJECTION;
            const bool copied = h->projection.assign(projection ? projection : "");
            h->longitude = longitude;
            h->latitude = latitude;
            h->orientation = orientation;
            return copied ? F_NO_ERROR : grdReportError(h, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__);
        },
        "grdSetGeoInfoUTMProj <%s> %g %g %g", grdTraceText(projection), longitude, latitude, orientation);
}

int32_t TOVA_CALL grdUpdateGeoInfoUTMProj(HeaderHandle header, const char* projection, double longitude,
                                          double latitude, double orientation) {
    return withHeader(
        header, __LINE__,
        [&](HeaderHandle h) {
            // The header on disk keeps its size: refused, without a report,
            // whenever the new text would not fit the stored one.
            const size_t n = projection ? std::strlen(projection) : 0;
            if (h->geoInfoType != F_UTM_PROJECTION || h->projection.isNull() || n > h->projection.length())
                return static_cast<int32_t>(F_ERR_VALUE);
            h->projection.overwriteKeepLength(projection);
            h->longitude = longitude;
            h->latitude = latitude;
            h->orientation = orientation;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdUpdateGeoInfoUTMProj <%s> %g %g %g", grdTraceText(projection), longitude, latitude, orientation);
}

int32_t TOVA_CALL grdGetGeoInfoUTMProj(HeaderHandle header, const char** projection, double* longitude,
                                       double* latitude, double* orientation) {
    return withHeader(
        header, __LINE__,
        [&](HeaderHandle h) {
            if (h->geoInfoType == F_UNDEFINED_GEOINFO)
                return grdReportError(h, nullptr, 0, F_ERR_ARGUMENT, kModule, __LINE__);
            if (h->geoInfoType != F_UTM_PROJECTION)
                return grdReportError(h, nullptr, 0, F_ERR_VALUE, kModule, __LINE__);
            if (projection) *projection = h->projection.orEmpty();
            if (longitude) *longitude = h->longitude;
            if (latitude) *latitude = h->latitude;
            if (orientation) *orientation = h->orientation;
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetGeoInfoUTMProj");
}

int32_t TOVA_CALL grdSetGeoInfoUndefined(HeaderHandle header) {
    return withHeader(
        header, __LINE__,
        [](HeaderHandle h) {
            h->geoInfoType = F_UNDEFINED_GEOINFO;
            h->projection.reset();
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdSetGeoInfoUndefined");
}

// ---- Custom blocks -------------------------------------------------------------

int32_t TOVA_CALL grdAddCustomBlock(HeaderHandle header, int32_t simpleType, const char* name, int32_t count,
                                    const void* data) {
    return withHeader(
        header, __LINE__,
        [&](HeaderHandle h) {
            const int32_t width = grdSimpleTypeSize(simpleType);
            if (count < 0) return grdReportError(h, nullptr, 0, F_ERR_VALUE, kModule, __LINE__);
            if (width > 0 && count > 0 && data == nullptr)
                return grdReportError(h, nullptr, 0, F_ERR_ARGUMENT, kModule, __LINE__);
            std::unique_ptr<GrdCustomBlock>* end = &h->customBlocks;
            while (*end) end = &(*end)->next;
            GrdCustomBlock* block = grdNew<GrdCustomBlock>();
            if (block == nullptr) return grdReportError(h, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__);
            end->reset(block);
            block->type = simpleType;
            block->count = count;
            // A block whose name or data cannot be copied stays in the chain.
            int32_t status = F_NO_ERROR;
            if (!block->name.assign(name ? name : ""))
                status = grdReportError(h, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__);
            if (width > 0) {
                const int64_t bytes = int64_t{count} * width;
                block->data = grdAllocArray<unsigned char>(bytes);
                if (!block->data) {
                    if (status == F_NO_ERROR) status = grdReportError(h, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__);
                } else if (bytes > 0) {
                    std::memcpy(block->data.get(), data, static_cast<size_t>(bytes));
                }
            }
            return status;
        },
        "grdAddCustomBlock %d <%s> %d", simpleType, grdTraceText(name), count);
}

int32_t TOVA_CALL grdGetCustomBlockRef(HeaderHandle header, CustomBlockHandle* block) {
    return withHeader(
        header, __LINE__,
        [&](HeaderHandle h) {
            if (block) *block = h->customBlocks.get();
            return static_cast<int32_t>(F_NO_ERROR);
        },
        "grdGetCustomBlockRef");
}

int32_t TOVA_CALL grdGetCustomBlock(CustomBlockHandle block, int32_t* simpleType, const char** name,
                                    int32_t* count, const void** data, CustomBlockHandle* next) {
    GrdApiTrace trace("grdGetCustomBlock");
    const int32_t status = grdCheckCustomBlock(block, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    if (simpleType) *simpleType = block->type;
    if (name) *name = block->name.orEmpty();
    if (count) *count = block->count;
    if (data && grdSimpleTypeSize(block->type) > 0) *data = block->data.get();
    if (next) *next = block->next.get();
    return trace.done(F_NO_ERROR);
}

}  // extern "C"
