// Gridded data-file layer, module grdheader: the header object (creation,
// destruction, type texts, version), the item record's life cycle and element
// counts shared by every module, and the argument checks with which every API
// function begins.
#include "grd/grdheader.h"

#include <cstring>
#include <initializer_list>
#include <limits>

#include "grd/grdio.h"
#include "qty/qty.h"

namespace {

constexpr const char* kModule = kModGrdHeader;

int32_t g_failAllocation = 0;  // test hook: countdown to a failing allocation

char g_emptyText[1] = {0};  // shared by every empty GrdText, never written

}  // namespace

// ---- Allocation ----------------------------------------------------------------

bool grdAllocationFails() noexcept {
    if (g_failAllocation <= 0) return false;
    return --g_failAllocation == 0;
}

void grdTestFailAllocation(int32_t nth) noexcept { g_failAllocation = nth > 0 ? nth : 0; }

void* grdAllocRaw(size_t bytes) noexcept {
    if (grdAllocationFails()) return nullptr;
    return std::calloc(bytes > 0 ? bytes : 1, 1);
}

int32_t grdCheckAllocZeroed(void** out, size_t bytes, const char* module, int32_t line) {
    const bool trace = tova::traceApiOn();
    if (trace) DebugEnter("grdCheckTypeSize");
    void* p = grdAllocRaw(bytes);
    int32_t status = F_NO_ERROR;
    if (p == nullptr) status = grdReportError(nullptr, nullptr, 0, F_ERR_MEMORY, module, line);
    if (out != nullptr) *out = p;
    else std::free(p);
    if (trace) DebugExit("%p [%d]", p, status);
    return status;
}

// ---- Texts -----------------------------------------------------------------------

void GrdText::Free::operator()(char* p) const noexcept {
    if (p != g_emptyText) std::free(p);
}

size_t GrdText::length() const noexcept { return p_ ? std::strlen(p_.get()) : 0; }

bool GrdText::assign(const char* text) noexcept {
    if (text == nullptr) {
        p_.reset();
        return true;
    }
    const size_t n = std::strlen(text);
    if (n == 0) {
        p_.reset(g_emptyText);
        return true;
    }
    // Copy before releasing: text may point into the current value.
    char* copy = static_cast<char*>(grdAllocRaw(n + 1));
    if (copy != nullptr) std::memcpy(copy, text, n + 1);
    p_.reset(copy);
    return copy != nullptr;
}

void GrdText::overwriteKeepLength(const char* text) noexcept {
    const size_t stored = length();
    if (stored == 0) return;
    const size_t n = text ? std::strlen(text) : 0;
    const size_t copied = n < stored ? n : stored;
    if (copied > 0) std::memmove(p_.get(), text, copied);
    std::memset(p_.get() + copied, ' ', stored - copied);
}

// ---- Items -------------------------------------------------------------------------

GrdAxisFamily grdAxisFamily(int32_t axisType) noexcept {
    switch (axisType) {
        case F_EQ_AXIS_D0:
        case F_EQ_AXIS_D1:
        case F_EQ_AXIS_D2:
        case F_EQ_AXIS_D3:
        case F_EQ_AXIS_D4:
            return GrdAxisFamily::Equidistant;
        case F_NEQ_AXIS_D1:
        case F_NEQ_AXIS_D2:
        case F_NEQ_AXIS_D3:
            return GrdAxisFamily::NonEquidistant;
        case F_CURVE_LINEAR_AXIS_D2:
        case F_CURVE_LINEAR_AXIS_D3:
            return GrdAxisFamily::CurveLinear;
        case F_TVAR_AXIS_D1:
        case F_TVAR_AXIS_D2:
        case F_TVAR_AXIS_D3:
            return GrdAxisFamily::TimeVarying;
        default:
            return GrdAxisFamily::Undefined;
    }
}

namespace {

// Clears every field of the record except the statistics, the associations
// and the static flag (freeing texts and coordinate arrays).
void clearItem(GrdItem* item) noexcept {
    GrdItem fresh;
    fresh.elemStats = std::move(item->elemStats);
    fresh.elemStatsCount = item->elemStatsCount;
    fresh.assocStatic = std::move(item->assocStatic);
    fresh.isStatic = item->isStatic;
    *item = std::move(fresh);
}

void setReferences(GrdItem* item, float value) noexcept {
    item->refX = item->refY = item->refZ = value;
    item->alpha = item->phi = item->theta = value;
}

}  // namespace

void grdItemInit(GrdItem* item, float deleteValue) noexcept {
    clearItem(item);
    item->name.assign("");
    item->unitText.assign("");
    setReferences(item, deleteValue);
}

void grdItemReset(GrdItem* item) noexcept {
    clearItem(item);
    setReferences(item, F_DELETE_VALUE_FLOAT);
}

namespace {

// Product of non-negative factors, saturated at INT64_MAX.
int64_t product(std::initializer_list<int64_t> factors) noexcept {
    int64_t p = 1;
    for (int64_t f : factors) {
        if (f != 0 && p > std::numeric_limits<int64_t>::max() / f) return std::numeric_limits<int64_t>::max();
        p *= f;
    }
    return p;
}

}  // namespace

int64_t grdItemFullElements(const GrdItem* item) noexcept {
    const int64_t x = item->size[0], y = item->size[1], z = item->size[2], t = item->size[3];
    switch (item->axisType) {
        case F_EQ_AXIS_D0:
            return 1;
        case F_EQ_AXIS_D1:
        case F_NEQ_AXIS_D1:
        case F_TVAR_AXIS_D1:
            return x < 0 ? -1 : x;
        case F_EQ_AXIS_D2:
        case F_NEQ_AXIS_D2:
        case F_TVAR_AXIS_D2:
        case F_CURVE_LINEAR_AXIS_D2:
            return (x < 0 || y < 0) ? -1 : product({x, y});
        case F_EQ_AXIS_D3:
        case F_NEQ_AXIS_D3:
        case F_TVAR_AXIS_D3:
        case F_CURVE_LINEAR_AXIS_D3:
            return (x < 0 || y < 0 || z < 0) ? -1 : product({x, y, z});
        case F_EQ_AXIS_D4:
            return (x < 0 || y < 0 || z < 0 || t < 0) ? -1 : product({x, y, z, t});
        default:
            return -1;
    }
}

namespace {

int64_t cappedByKey(const GrdItem* item, bool requireEnabled) noexcept {
    const int64_t full = grdItemFullElements(item);
    const GrdHeader* h = item->owner;
    if (full < 0 || h == nullptr || item->isStatic || !h->fileCompressed) return full;
    if (requireEnabled && !h->itemCompressionEnabled) return full;
    return full < h->keyLength ? full : h->keyLength;
}

}  // namespace

int64_t grdItemElementCount(const GrdItem* item) noexcept { return cappedByKey(item, true); }
int64_t grdItemUsedElementCount(const GrdItem* item) noexcept { return cappedByKey(item, false); }

int32_t grdSimpleTypeSize(int32_t simpleType) noexcept {
    switch (simpleType) {
        case RCF_FLOAT:
        case RCF_INT4:
        case RCF_UINT4:
            return 4;
        case RCF_DOUBLE:
            return 8;
        case RCF_BYTE:
            return 1;
        case RCF_INT2:
        case RCF_UINT2:
            return 2;
        default:
            return 0;
    }
}

int32_t grdAxisGeometryType(int32_t axisType) noexcept {
    if (axisType == F_EQ_AXIS_D0) return QTY_ITEM_GEOMETRY_0D;
    if (axisType >= F_EQ_AXIS_D1 && axisType <= F_TVAR_AXIS_D1) return QTY_ITEM_GEOMETRY_1D;
    if (axisType >= F_EQ_AXIS_D2 && axisType <= F_TVAR_AXIS_D2) return QTY_ITEM_GEOMETRY_2D;
    if (axisType >= F_EQ_AXIS_D3 && axisType <= F_EQ_AXIS_D4) return QTY_ITEM_GEOMETRY_3D;
    return QTY_ITEM_UNDEFINED;
}

int32_t grdBaseUnit(int32_t itemType) noexcept {
    int32_t unit = 0;
    const char* text = nullptr;
    qtyGetItemUnitSeq(itemType, 1, &unit, &text);
    return unit;
}

const char* grdUnitText(int32_t unitKey, const GrdText& stored, int32_t* unit) noexcept {
    const char* text = nullptr;
    if (qtyGetUnitKey(unitKey, &text) && text != nullptr) return text;
    if (!stored.isNull()) {
        if (unit != nullptr) qtyGetUnitTag(stored.get(), unit);
        return stored.get();
    }
    return "";
}

int32_t grdItemInitStatistics(GrdHeader* header, GrdItem* item, const char* module, int32_t line) noexcept {
    item->elemStats.reset();
    item->elemStatsCount = 0;
    const int32_t type = header->statsType;
    if (type < F_ITEM_STATS_GLOBAL || type > F_ITEM_STATS_ELEMENT_ALT)
        return grdReportError(header, nullptr, 0, F_ERR_VALUE, module, line);
    const double del = header->deleteValDouble;
    item->globalMax = del;
    item->globalMin = del;
    item->globalDeletes = 0.0;
    if (type == F_ITEM_STATS_GLOBAL) return F_NO_ERROR;

    int64_t count = grdItemElementCount(item);
    if (count < 0) count = 0;
    if (count > std::numeric_limits<int32_t>::max())
        return grdReportError(header, nullptr, 0, F_ERR_VALUE, module, line);
    GrdArray<GrdElementStats> stats = grdAllocArray<GrdElementStats>(count);
    if (!stats) return grdReportError(header, nullptr, 0, F_ERR_MEMORY, module, line);
    for (int64_t i = 0; i < count; ++i) {
        stats[i].max = del;
        stats[i].min = del;
        stats[i].previous = del;
    }
    item->elemStats = std::move(stats);
    item->elemStatsCount = static_cast<int32_t>(count);
    return F_NO_ERROR;
}

// ---- Custom blocks and time axis ----------------------------------------------------------

GrdCustomBlock::~GrdCustomBlock() {
    // Unlink the rest of the chain one block at a time: a long chain must not
    // recurse through the destructors.
    while (next) next = std::move(next->next);
}

GrdTimeValues* grdTimeAxisValues(GrdHeader* header) noexcept {
    switch (header->timeAxis.type) {
        case F_TM_EQ_AXIS:
        case F_TM_NEQ_AXIS:
            return &header->timeAxis.time;
        case F_CAL_EQ_AXIS:
        case F_CAL_NEQ_AXIS:
            return &header->timeAxis.calendar;
        default:
            return nullptr;
    }
}

// ---- Header --------------------------------------------------------------------------------

GrdHeader::~GrdHeader() {
    // The plug-in may still use the items; release it first.
    if (extension.release != nullptr) extension.release(this);
    if (legacy.release != nullptr) legacy.release(this);
}

GrdHeader* grdHeaderNew() noexcept { return grdNew<GrdHeader>(); }

int32_t grdHeaderAllocItems(GrdHeader* header, int32_t n) noexcept {
    if (n < 0) return F_ERR_VALUE;
    std::unique_ptr<GrdItem[]> items = grdNewArray<GrdItem>(n);
    if (!items) return F_ERR_MEMORY;
    for (int32_t i = 0; i < n; ++i) grdItemInit(&items[i], header->deleteValFloat);
    header->items = std::move(items);
    header->noOfItems = n;
    return F_NO_ERROR;
}

GrdItem* grdHeaderItem(GrdHeader* header, int32_t itemNo) noexcept {
    if (header == nullptr || itemNo < 1 || itemNo > header->noOfItems || !header->items) return nullptr;
    return &header->items[itemNo - 1];
}

// ---- Argument checks --------------------------------------------------------------------------

namespace {

// Runs one null test with its trace lines.
int32_t checkNotNull(const char* name, const void* p, const char* module, int32_t line) {
    GrdApiTrace trace(name);
    return trace.done(p != nullptr ? F_NO_ERROR : grdReportError(nullptr, nullptr, 0, F_ERR_ARGUMENT, module, line));
}

}  // namespace

int32_t grdCheckHeader(HeaderHandle header, const char* module, int32_t line) {
    return checkNotNull("grdCheckHeader", header, module, line);
}

int32_t grdCheckFile(FileHandle file, const char* module, int32_t line) {
    return checkNotNull("grdCheckFile", file, module, line);
}

int32_t grdCheckHeaderFile(HeaderHandle header, FileHandle file, const char* module, int32_t line) {
    GrdApiTrace trace("grdCheckHeaderFile");
    const int32_t status = grdCheckHeader(header, module, line);
    return trace.done(status != F_NO_ERROR ? status : grdCheckFile(file, module, line));
}

int32_t grdCheckHeaderItemNo(HeaderHandle header, int32_t itemNo, const char* module, int32_t line) {
    GrdApiTrace trace("grdCheckHeaderItemNo %d", itemNo);
    int32_t status = grdCheckHeader(header, module, line);
    if (status == F_NO_ERROR && (itemNo < 1 || itemNo > header->noOfItems))
        status = grdReportError(header, nullptr, 0, F_ERR_ITEMNO, module, line);
    return trace.done(status);
}

int32_t grdCheckItem(ItemHandle item, const char* module, int32_t line) {
    return checkNotNull("grdCheckItem", item, module, line);
}

int32_t grdCheckVector(ItemHandle vector, const char* module, int32_t line) {
    return checkNotNull("grdCheckVector", vector, module, line);
}

int32_t grdCheckVectorFile(ItemHandle vector, FileHandle file, const char* module, int32_t line) {
    GrdApiTrace trace("grdCheckVectorFile");
    const int32_t status = grdCheckVector(vector, module, line);
    return trace.done(status != F_NO_ERROR ? status : grdCheckFile(file, module, line));
}

int32_t grdCheckCustomBlock(CustomBlockHandle block, const char* module, int32_t line) {
    return checkNotNull("grdCheckCustomBlock", block, module, line);
}

// ---- Exported: header object ----------------------------------------------------------------

extern "C" {

int32_t TOVA_CALL grdHeaderCreate(int32_t fileType, const char* fileTitle, const char* appTitle,
                                  int32_t appVersionNo, int32_t noOfItems, int32_t statsType, HeaderHandle* header) {
    GrdApiTrace trace("grdHeaderCreate %d <%s> <%s> %d %d %d", fileType, grdTraceText(fileTitle),
                      grdTraceText(appTitle), appVersionNo, noOfItems, statsType);
    if (header != nullptr) *header = nullptr;
    if (statsType < F_ITEM_STATS_GLOBAL || statsType > F_ITEM_STATS_ELEMENT_ALT || noOfItems < 1)
        return trace.done(grdReportError(nullptr, nullptr, 0, F_ERR_VALUE, kModule, __LINE__));

    std::unique_ptr<GrdHeader> h(grdHeaderNew());
    if (!h) return trace.done(grdReportError(nullptr, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__));
    h->fileType = fileType;
    bool ok = h->fileTitle.assign(fileTitle ? fileTitle : "");
    ok = h->appTitle.assign(appTitle ? appTitle : "") && ok;
    h->appVersionNo = appVersionNo;
    h->statsType = statsType;
    if (!ok || grdHeaderAllocItems(h.get(), noOfItems) != F_NO_ERROR)
        return trace.done(grdReportError(nullptr, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__));
    if (header != nullptr) *header = h.release();
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdHeaderDestroy(HeaderHandle* header) {
    GrdApiTrace trace("grdHeaderDestroy");
    const int32_t status = grdCheckHeader(header ? *header : nullptr, kModule, __LINE__);
    if (header != nullptr) {
        delete *header;
        *header = nullptr;
    }
    return trace.done(status);
}

const char* TOVA_CALL grdFileTypeStr(int32_t fileType) {
    GrdApiTrace trace("grdFileTypeStr %d", fileType);
    switch (fileType) {
        case F_UNDEFINED_FILE_TYPE:
            return "F_UNDEFINED_FILE_TYPE";
        case F_EQTIME_FIXEDSPACE_ALLITEMS:
            return "F_EQTIME_FIXEDSPACE_ALLITEMS";
        case F_EQTIME_TVARSPACE_ALLITEMS:
            return "F_EQTIME_TVARSPACE_ALLITEMS";
        case F_NEQTIME_FIXEDSPACE_ALLITEMS:
            return "F_NEQTIME_FIXEDSPACE_ALLITEMS";
        case F_NEQTIME_FIXEDSPACE_VARITEMS:
            return "F_NEQTIME_FIXEDSPACE_VARITEMS";
        case F_NEQTIME_TVARSPACE_VARITEMS:
            return "F_NEQTIME_TVARSPACE_VARITEMS";
        default:
            return "*** FileType error ***";
    }
}

const char* TOVA_CALL grdTimeAxisTypeStr(int32_t timeAxisType) {
    GrdApiTrace trace("grdTimeAxisTypeStr %d", timeAxisType);
    switch (timeAxisType) {
        case F_UNDEFINED_TAXIS:
            return "F_UNDEFINED_TAXIS";
        case F_TM_EQ_AXIS:
            return "F_TM_EQ_AXIS";
        case F_TM_NEQ_AXIS:
            return "F_TM_NEQ_AXIS";
        case F_CAL_EQ_AXIS:
            return "F_CAL_EQ_AXIS";
        case F_CAL_NEQ_AXIS:
            return "F_CAL_NEQ_AXIS";
        default:
            return "*** TimeAxis error ***";
    }
}

const char* TOVA_CALL grdSimpleTypeStr(int32_t simpleType) {
    GrdApiTrace trace("grdSimpleTypeStr %d", simpleType);
    return rcfSimpName(simpleType);
}

int32_t TOVA_CALL grdGetVersionCurrent(void) {
    GrdApiTrace trace("grdGetIOVersionNo");
    return trace.done(F_GRD_VERSION);
}

}  // extern "C"
