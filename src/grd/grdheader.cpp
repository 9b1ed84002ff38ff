// Gridded data-file layer, module grdheader: the header object (creation,
// destruction, type texts, version), the item record's life cycle and element
// counts shared by every module, the argument checks with which every API
// function begins, and the header's persistence: the tag stream that stores
// it in a record file, its reader and the in-place updates.
#include "grd/grdheader.h"

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstring>
#include <initializer_list>
#include <limits>

#include "common/capi.h"
#include "grd/fileio.h"
#include "grd/grdimage.h"
#include "grd/grdio.h"
#include "grd/grdstream.h"
#include "qty/qty.h"

namespace {

constexpr const char* kModule = kModGrdHeader;

char g_emptyText[1] = {0};  // shared by every empty GrdText, never written

}  // namespace

// ---- Allocation ----------------------------------------------------------------

// The hook is the record layer's: one countdown over every allocation.
bool grdAllocationFails() noexcept { return rcfAllocationFails(); }

void grdTestFailAllocation(int32_t nth) noexcept { rcfTestFailAllocation(nth); }

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

uint64_t grdNextHeaderSerial() noexcept {
    static std::atomic<uint64_t> last{0};
    return last.fetch_add(1, std::memory_order_relaxed) + 1;
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
    int32_t status = grdCheckHeader(header, module, line);
    if (status == F_NO_ERROR) status = grdCheckFile(file, module, line);
    // A header of another file would write its own layout into this one, or
    // read this one's records as its items.
    if (status == F_NO_ERROR && file->headerSerial != 0 && file->headerSerial != header->serial)
        status = grdReportError(header, file, 0, F_ERR_ARGUMENT, module, line);
    return trace.done(status);
}

void grdBindFile(const GrdHeader* header, FileHandle file) noexcept { file->headerSerial = header->serial; }

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

// ==== Header persistence ==========================================================================
//
// From appBase on, the header is a sequence of logical blocks whose
// identifiers are their tags (grdstream.h):
//   10000, 10004, 10001, 10002, 10003, 10012, 10013, 10005, 10006-10010, [10011]
//   20000, one of 20051-20054 (older files: 20001-20004, time unit as text)
//   30000, 30001, per item 30005 or 30002, 30006, its axis block (31051-31062;
//     older files 31001-31010 without the axis unit), [30003], [30004]
//   one 60000 block per custom block
// and the static (40000) or dynamic (50000) section follows.
//
// NeqD1 axes: the model keeps size + 1 x boundaries (doubles), the block
// holds size points of three floats x, y, z. Writing, point i takes x from
// boundary i, and y and z from the points read from the file for this axis
// (GrdItem::diskPoints) or 0 for an axis set in memory; the last boundary
// has no place in the block. Reading, boundary i is the x of point i and the
// last boundary continues the last spacing (x of the only point for one
// point, 0 for none), and the points are kept. A file read and written again
// thus keeps its bytes.

namespace {

// Tags of the header fields and the time and axis blocks.
constexpr int32_t kTagFileTitle = 10001;
constexpr int32_t kTagAppTitle = 10002;
constexpr int32_t kTagAppVersion = 10003;
constexpr int32_t kTagFileType = 10004;
constexpr int32_t kTagStatsType = 10005;
constexpr int32_t kTagDeleteFloat = 10006;
constexpr int32_t kTagDeleteDouble = 10007;
constexpr int32_t kTagDeleteByte = 10008;
constexpr int32_t kTagDeleteInt = 10009;
constexpr int32_t kTagDeleteUnsigned = 10010;
constexpr int32_t kTagProjection = 10011;
constexpr int32_t kTagDataType = 10012;
constexpr int32_t kTagCompressed = 10013;
constexpr int32_t kTagTimeOlder = 20000;  // + kind 1-4: the time unit is a text
constexpr int32_t kTagTime = 20050;       // + kind 1-4
constexpr int32_t kTagAxisOlder = 31000;  // + axis type 1-10: no axis unit
constexpr int32_t kTagAxis = 31050;       // + axis type 1-10
constexpr int32_t kTagCurveLinearD2 = 31061;
constexpr int32_t kTagCurveLinearD3 = 31062;

// Fewest bytes an item takes in the stream: a 30002 block with empty name
// and unit texts (3 + 9 + 6 + 6 + 9 + 29 + 17 + 17 + 1 = 97) and an empty
// older EqD0 axis block (4).
constexpr int64_t kMinItemBytes = 101;

int32_t report(HeaderHandle header, FileHandle file, int32_t code, int32_t line) {
    return grdReportError(header, file, 0, code, kModule, line);
}

bool isTimeTag(int32_t tag) {
    return (tag > kTagTimeOlder && tag <= kTagTimeOlder + F_CAL_NEQ_AXIS) ||
           (tag > kTagTime && tag <= kTagTime + F_CAL_NEQ_AXIS);
}

int32_t timeKindOfTag(int32_t tag) { return tag - (tag < kTagTime ? kTagTimeOlder : kTagTime); }

// Directions (sizes) of each axis type; -1 for none.
int32_t axisDirs(int32_t axisType) {
    static constexpr int8_t kDirs[] = {-1, 0, 1, 1, 1, 2, 2, 2, 3, 3, 3, 4, 2, 3};
    return axisType >= 0 && axisType <= F_CURVE_LINEAR_AXIS_D3 ? kDirs[axisType] : -1;
}

// The tag of an axis kind in the current or the older form; 0 when it has
// none (EqD4 has none on purpose: such items live only in memory).
uint16_t axisTagOf(int32_t axisType, bool older) {
    if (axisType >= F_EQ_AXIS_D0 && axisType <= F_TVAR_AXIS_D3)
        return static_cast<uint16_t>((older ? kTagAxisOlder : kTagAxis) + axisType);
    if (older) return 0;
    if (axisType == F_CURVE_LINEAR_AXIS_D2) return kTagCurveLinearD2;
    if (axisType == F_CURVE_LINEAR_AXIS_D3) return kTagCurveLinearD3;
    return 0;
}

// The axis type of an axis tag (0 for another tag) and whether it is older.
int32_t axisTypeOfTag(int32_t tag, bool* older) {
    *older = tag > kTagAxisOlder && tag <= kTagAxisOlder + F_TVAR_AXIS_D3;
    if (*older) return tag - kTagAxisOlder;
    if (tag > kTagAxis && tag <= kTagAxis + F_TVAR_AXIS_D3) return tag - kTagAxis;
    if (tag == kTagCurveLinearD2) return F_CURVE_LINEAR_AXIS_D2;
    if (tag == kTagCurveLinearD3) return F_CURVE_LINEAR_AXIS_D3;
    return 0;
}

// Values of coordinate array d: size + 1 (non-equidistant) or one per node
// (curvilinear); saturated just above what one record can count.
int64_t coordValues(int32_t axisType, const int32_t* size, int32_t d) {
    constexpr int64_t kOver = int64_t{UINT32_MAX} + 1;
    if (grdAxisFamily(axisType) == GrdAxisFamily::NonEquidistant) return int64_t{size[d]} + 1;
    int64_t nodes = 1;
    for (int32_t i = 0; i < axisDirs(axisType); ++i) {
        const int64_t factor = int64_t{size[i]} + 1;
        if (factor <= 0) return 0;
        if (nodes > kOver / factor) return kOver;
        nodes *= factor;
    }
    return nodes;
}

// Bytes from the logical position to the end of the file (0 when unknown);
// the position is kept.
int64_t remainingBytes(FileHandle file) {
    const int64_t here = rcfTell64(file);
    if (here < 0) return 0;
    rcfSeek64(file, 0, 0, 2);
    const int64_t end = rcfTell64(file);
    grdSeekTo(file, here);
    return end > here ? end - here : 0;
}

// ---- Blocks being written ---------------------------------------------------------------------

// A logical block built for writing. Records of no values are left out (the
// format never holds them). With a shape, the block as it stands in the
// file, every text takes the length of the shape's record at its place,
// padded with blanks or cut, so that an in-place rewrite keeps the size.
class OutBlock {
public:
    explicit OutBlock(HeaderHandle header, const LrecNode* shape = nullptr) : header_(header), shapeAt_(shape) {}
    ~OutBlock() {
        if (head_ != nullptr) FFreeLogicalBlock(head_);
    }
    OutBlock(const OutBlock&) = delete;
    OutBlock& operator=(const OutBlock&) = delete;

    // A record of count values copied from data (zeros when data is null).
    void add(int32_t type, uint64_t count, const void* data) {
        if (!admit(type, count)) return;
        const auto n = static_cast<uint32_t>(count);
        if (head_ == nullptr) {
            head_ = FCreateLogicalBlock(type, n, data);
            if (head_ == nullptr) status_ = F_ERR_VALUE;  // reported by the block layer
        } else {
            status_ = FAppendToLogicalBlock(type, n, data, head_);
        }
        placed();
    }
    template <class T>
    void value(int32_t type, T v) {
        add(type, 1, &v);
    }
    // A record that points at data without copying: large arrays, which
    // stay unchanged until the block is written.
    void borrow(int32_t type, uint64_t count, const void* data) {
        if (data == nullptr) return add(type, count, nullptr);
        link(type, count, const_cast<void*>(data), false);
    }
    // A record that takes over a buffer of grdAllocRaw (freed with the block).
    void adopt(int32_t type, uint64_t count, void* data) { link(type, count, data, true); }
    void text(const char* text);
    void fail(int32_t code) {
        if (status_ == F_NO_ERROR) status_ = code;
    }

    int32_t status() const { return status_; }
    const LrecNode* records() const { return head_; }
    bool sameShape(const LrecNode* list) const {
        const LrecNode* a = head_;
        for (; a != nullptr && list != nullptr; a = a->next, list = list->next)
            if (a->type != list->type || a->count != list->count) return false;
        return a == nullptr && list == nullptr;
    }
    int32_t write(uint16_t tag, FileHandle file, int32_t line) {
        return status_ != F_NO_ERROR ? status_ : grdCheckWriteLB(header_, tag, head_, file, kModule, line);
    }

private:
    // Whether a record may be added: no earlier failure, some values, and
    // not more bytes than one record can hold (2010 otherwise).
    bool admit(int32_t type, uint64_t count) {
        if (status_ != F_NO_ERROR || count == 0) return false;
        if (count > UINT32_MAX / (grdSimpleTypeSize(type) > 0 ? grdSimpleTypeSize(type) : 1)) {
            status_ = report(header_, nullptr, F_ERR_VALUE, __LINE__);
            return false;
        }
        return true;
    }
    void link(int32_t type, uint64_t count, void* data, bool owns) {
        GrdArray<unsigned char> owned(owns ? static_cast<unsigned char*>(data) : nullptr);
        if (!admit(type, count)) return;
        LrecNode* node = rcfLrecNodeNew(type, static_cast<uint32_t>(count), data, 0, head_);
        if (node == nullptr) {
            status_ = report(header_, nullptr, F_ERR_VALUE, __LINE__);
            return;
        }
        node->ownsData = owns ? 1 : 0;
        owned.release();
        if (head_ == nullptr) head_ = node;
        placed();
    }
    void placed() { shapeAt_ = shapeAt_ != nullptr ? shapeAt_->next : nullptr; }

    HeaderHandle header_;
    const LrecNode* shapeAt_;  // the shape's record at the place of the next one
    LrecNode* head_ = nullptr;
    int32_t status_ = F_NO_ERROR;
};

void OutBlock::text(const char* text) {
    const size_t length = std::strlen(text);
    if (shapeAt_ == nullptr || shapeAt_->type != RCF_BYTE || shapeAt_->count == 0)
        return add(RCF_BYTE, length + 1, text);
    const uint32_t stored = shapeAt_->count;  // text and terminator
    GrdArray<char> fitted = grdAllocArray<char>(stored);
    if (!fitted) return fail(report(header_, nullptr, F_ERR_MEMORY, __LINE__));
    const size_t kept = length < stored - 1 ? length : stored - 1;
    std::memcpy(fitted.get(), text, kept);
    std::memset(fitted.get() + kept, ' ', stored - 1 - kept);  // the terminator is the zero of the allocation
    adopt(RCF_BYTE, stored, fitted.release());
}

// ---- Block contents, shared by the writer and the in-place updates --------------------------------

// The block of a header field; false for a tag that is none.
bool fillHeaderField(const GrdHeader* h, int32_t tag, OutBlock& b) {
    switch (tag) {
        case kTagFileType: b.value(RCF_INT2, static_cast<int16_t>(h->fileType)); break;  // low 16 bits
        case kTagFileTitle: b.text(h->fileTitle.orEmpty()); break;
        case kTagAppTitle: b.text(h->appTitle.orEmpty()); break;
        case kTagAppVersion: b.value(RCF_INT4, h->appVersionNo); break;
        case kTagDataType: b.value(RCF_INT4, h->dataType); break;
        case kTagCompressed: b.value(RCF_INT4, h->fileCompressed); break;
        case kTagStatsType: b.value(RCF_INT4, h->statsType); break;
        case kTagDeleteFloat: b.value(RCF_FLOAT, h->deleteValFloat); break;
        case kTagDeleteDouble: b.value(RCF_DOUBLE, h->deleteValDouble); break;
        case kTagDeleteByte: b.value(RCF_BYTE, h->deleteValByte); break;
        case kTagDeleteInt: b.value(RCF_INT4, h->deleteValInt); break;
        case kTagDeleteUnsigned: b.value(RCF_UINT4, h->deleteValUnsignedInt); break;
        case kTagProjection: {
            b.text(h->projection.orEmpty());
            const double origin[3] = {h->longitude, h->latitude, h->orientation};
            b.add(RCF_DOUBLE, 3, origin);
            break;
        }
        default: return false;
    }
    return true;
}

// The time block of tag (current or older form); 2010 when the header's time
// axis is of another kind.
void fillTimeBlock(GrdHeader* h, int32_t tag, OutBlock& b) {
    const int32_t kind = timeKindOfTag(tag);
    const GrdTimeValues* v = grdTimeAxisValues(h);
    if (h->timeAxis.type != kind || v == nullptr) return b.fail(report(h, nullptr, F_ERR_VALUE, __LINE__));
    if (kind == F_CAL_EQ_AXIS || kind == F_CAL_NEQ_AXIS) {
        b.text(h->timeAxis.startDate);
        b.text(h->timeAxis.startTime);
    }
    if (tag < kTagTime) {
        b.text(grdUnitText(v->unit, v->unitText, nullptr));
    } else {
        b.value(RCF_INT4, v->unit);
    }
    const double times[2] = {v->start, v->step};  // the step is the span for the non-equidistant kinds
    b.add(RCF_DOUBLE, 2, times);
    const int32_t counters[2] = {v->timeSteps, v->firstIndex};
    b.add(RCF_INT4, 2, counters);
}

void fillItemBlock(const GrdItem* it, bool unitAsText, OutBlock& b) {
    b.value(RCF_INT4, it->itemType);
    b.text(it->name.orEmpty());
    if (unitAsText) {
        b.text(it->unitText.orEmpty());
    } else {
        b.value(RCF_INT4, it->unit);
    }
    b.value(RCF_INT4, it->dataType);
    const double summary[3] = {it->globalMax, it->globalMin, it->globalDeletes};
    b.add(RCF_DOUBLE, 3, summary);
    const float ref[3] = {it->refX, it->refY, it->refZ};
    b.add(RCF_FLOAT, 3, ref);
    const float orientation[3] = {it->alpha, it->phi, it->theta};
    b.add(RCF_FLOAT, 3, orientation);
}

// The NeqD1 points (see the mapping at the top of this section).
void fillNeqD1Points(HeaderHandle h, const GrdItem* it, OutBlock& b) {
    const int64_t n = it->size[0];
    if (n <= 0) return;
    GrdArray<float> points = grdAllocArray<float>(3 * n);
    if (!points) return b.fail(report(h, nullptr, F_ERR_MEMORY, __LINE__));
    const double* x = it->coords[0].get();
    const float* kept = it->diskPoints && it->diskPointCount == n ? it->diskPoints.get() : nullptr;
    for (int64_t i = 0; i < n; ++i) {
        points[3 * i] = x != nullptr ? static_cast<float>(x[i]) : 0.0f;
        points[3 * i + 1] = kept != nullptr ? kept[3 * i + 1] : 0.0f;
        points[3 * i + 2] = kept != nullptr ? kept[3 * i + 2] : 0.0f;
    }
    b.adopt(RCF_FLOAT, static_cast<uint64_t>(3 * n), points.release());
}

// The axis block (older: without the axis unit); 2010 for an axis kind
// without a tag.
void fillAxisBlock(HeaderHandle h, const GrdItem* it, bool older, OutBlock& b) {
    const int32_t type = it->axisType;
    if (axisTagOf(type, older) == 0) return b.fail(report(h, nullptr, F_ERR_VALUE, __LINE__));
    const int32_t dirs = axisDirs(type);
    int32_t ints[4];
    int32_t n = 0;
    if (!older) ints[n++] = it->axisUnit;
    for (int32_t d = 0; d < dirs; ++d) ints[n++] = it->size[d];
    b.add(RCF_INT4, static_cast<uint64_t>(n), ints);
    switch (grdAxisFamily(type)) {
        case GrdAxisFamily::Equidistant: {
            float values[6];
            if (type == F_EQ_AXIS_D1) {
                values[0] = it->step[0];  // EqD1 stores its step first
                values[1] = it->origin[0];
            } else {
                for (int32_t d = 0; d < dirs; ++d) {
                    values[d] = it->origin[d];
                    values[dirs + d] = it->step[d];
                }
            }
            b.add(RCF_FLOAT, static_cast<uint64_t>(2 * dirs), values);
            break;
        }
        case GrdAxisFamily::NonEquidistant:
            if (type == F_NEQ_AXIS_D1) return fillNeqD1Points(h, it, b);
            [[fallthrough]];
        case GrdAxisFamily::CurveLinear:
            for (int32_t d = 0; d < dirs; ++d)
                b.borrow(RCF_DOUBLE, static_cast<uint64_t>(coordValues(type, it->size, d)), it->coords[d].get());
            break;
        default:
            break;
    }
}

// 30003: nine doubles per used element. Records that the item's array lacks
// (it never does once its statistics were set up) go out in their initial
// state.
void fillStatsBlock(HeaderHandle h, const GrdItem* it, OutBlock& b) {
    int64_t used = grdItemUsedElementCount(it);
    if (used < 0) used = 0;
    if (it->elemStats && used <= it->elemStatsCount) return b.borrow(RCF_DOUBLE, 9 * static_cast<uint64_t>(used), it->elemStats.get());
    if (used > int64_t{UINT32_MAX} / static_cast<int64_t>(sizeof(GrdElementStats)))
        return b.fail(report(h, nullptr, F_ERR_VALUE, __LINE__));
    GrdArray<GrdElementStats> stats = grdAllocArray<GrdElementStats>(used);
    if (!stats) return b.fail(report(h, nullptr, F_ERR_MEMORY, __LINE__));
    const int64_t have = it->elemStats ? it->elemStatsCount : 0;
    for (int64_t i = 0; i < used; ++i) {
        if (i < have) {
            stats[i] = it->elemStats[i];
        } else {
            stats[i].max = stats[i].min = stats[i].previous = h->deleteValDouble;
        }
    }
    b.adopt(RCF_DOUBLE, 9 * static_cast<uint64_t>(used), stats.release());
}

void fillCustomBlock(const GrdCustomBlock* c, OutBlock& b) {
    b.text(c->name.orEmpty());
    if (grdSimpleTypeSize(c->type) > 0 && c->count > 0) b.borrow(c->type, static_cast<uint64_t>(c->count), c->data.get());
}

template <class Fill>
int32_t writeBlock(HeaderHandle header, FileHandle file, uint16_t tag, int32_t line, Fill fill) {
    OutBlock block(header);
    fill(block);
    return block.write(tag, file, line);
}

int32_t writeEmptyBlock(HeaderHandle header, FileHandle file, uint16_t tag, int32_t line) {
    return writeBlock(header, file, tag, line, [](OutBlock&) {});
}

}  // namespace

// ---- Writer ---------------------------------------------------------------------------------------

int32_t grdWriteItemRecord(HeaderHandle header, GrdItem* item, FileHandle file) {
    if (item == nullptr || file == nullptr) return report(header, file, F_ERR_ARGUMENT, __LINE__);
    const bool unitAsText = item->unit < 0;
    if (!unitAsText && !qtyItemUnitEqv(item->itemType, item->unit)) return report(header, file, F_ERR_UNIT, __LINE__);
    int32_t status = writeBlock(header, file, unitAsText ? kTagItemText : kTagItem, __LINE__,
                                [&](OutBlock& b) { fillItemBlock(item, unitAsText, b); });
    if (status == F_NO_ERROR)
        status = writeBlock(header, file, kTagValueType, __LINE__,
                            [&](OutBlock& b) { b.value(RCF_INT4, item->valueType); });
    if (status == F_NO_ERROR)
        status = writeBlock(header, file, axisTagOf(item->axisType, false), __LINE__,
                            [&](OutBlock& b) { fillAxisBlock(header, item, false, b); });
    return status;
}

int32_t grdWriteHeader(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdWriteHeader");
    int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    grdBindFile(header, file);
    const auto field = [&](uint16_t tag) {
        if (status == F_NO_ERROR)
            status = writeBlock(header, file, tag, __LINE__, [&](OutBlock& b) { fillHeaderField(header, tag, b); });
    };

    // The data layer reads the delete values of float and double data from
    // the file object.
    file->deleteValFloat = header->deleteValFloat;
    file->deleteValDouble = header->deleteValDouble;
    status = writeEmptyBlock(header, file, kTagHeaderStart, __LINE__);
    for (uint16_t tag : {kTagFileType, kTagFileTitle, kTagAppTitle, kTagAppVersion, kTagDataType, kTagCompressed,
                         kTagStatsType, kTagDeleteFloat, kTagDeleteDouble, kTagDeleteByte, kTagDeleteInt,
                         kTagDeleteUnsigned})
        field(tag);
    if (header->geoInfoType == F_UTM_PROJECTION) {
        field(kTagProjection);
    } else if (status == F_NO_ERROR && header->geoInfoType != F_UNDEFINED_GEOINFO) {
        status = report(header, file, F_ERR_VALUE, __LINE__);
    }

    if (status == F_NO_ERROR) status = writeEmptyBlock(header, file, kTagTimeStart, __LINE__);
    const int32_t kind = header->timeAxis.type;
    if (status == F_NO_ERROR) {
        if (kind >= F_TM_EQ_AXIS && kind <= F_CAL_NEQ_AXIS) {
            const auto tag = static_cast<uint16_t>(kTagTime + kind);
            status = writeBlock(header, file, tag, __LINE__, [&](OutBlock& b) { fillTimeBlock(header, tag, b); });
        } else {
            status = report(header, file, F_ERR_VALUE, __LINE__);
        }
    }

    if (status == F_NO_ERROR) status = writeEmptyBlock(header, file, kTagItemStart, __LINE__);
    if (status == F_NO_ERROR)
        status = writeBlock(header, file, kTagItemCount, __LINE__,
                            [&](OutBlock& b) { b.value(RCF_INT4, header->noOfItems); });
    trace.print("for_loop start here");
    for (int32_t n = 1; n <= header->noOfItems && status == F_NO_ERROR; ++n) {
        GrdItem* item = &header->items[n - 1];
        status = grdWriteItemRecord(header, item, file);
        if (status != F_NO_ERROR) break;
        if (header->statsType == F_ITEM_STATS_ELEMENT || header->statsType == F_ITEM_STATS_ELEMENT_ALT) {
            status = writeBlock(header, file, kTagElemStats, __LINE__, [&](OutBlock& b) { fillStatsBlock(header, item, b); });
        } else if (header->statsType != F_ITEM_STATS_GLOBAL) {
            status = report(header, file, F_ERR_VALUE, __LINE__);
        }
        if (status == F_NO_ERROR && !item->assocStatic.empty())
            status = writeBlock(header, file, kTagAssocStatic, __LINE__, [&](OutBlock& b) {
                b.borrow(RCF_UINT4, item->assocStatic.size(), item->assocStatic.data());
            });
    }
    trace.print("ends here");

    for (const GrdCustomBlock* c = header->customBlocks.get(); c != nullptr && status == F_NO_ERROR; c = c->next.get())
        status = writeBlock(header, file, kTagCustomBlock, __LINE__, [&](OutBlock& b) { fillCustomBlock(c, b); });
    if (status == F_NO_ERROR) file->headerEnd = rcfTell64(file);
    return trace.done(status);
}

// ---- Reader ----------------------------------------------------------------------------------------

namespace {

// A logical block read from the file, handed out record by record; each
// record is checked for its type and count (0: any) before it is used.
class InBlock {
public:
    explicit InBlock(HeaderHandle header) : header_(header) {}
    ~InBlock() {
        if (head_ != nullptr) FFreeLogicalBlock(head_);
    }
    InBlock(const InBlock&) = delete;
    InBlock& operator=(const InBlock&) = delete;

    // Reads the next block. With a type its first record must be of that
    // type (and count) and is handed out at once as first(); without, the
    // block may be empty. The file's pending error is taken: it wins.
    int32_t read(FileHandle file, int32_t type, uint32_t count, int32_t line) {
        if (type != 0) {
            status_ = grdCheckReadTypeSize(header_, file, type, count, &head_, kModule, line);
            cursor_ = head_ != nullptr ? head_->next : nullptr;
        } else {
            head_ = FReadLogicalBlock(file);
            cursor_ = head_;
        }
        const int32_t pending = rcfGetError(file);
        if (pending != F_NO_ERROR && status_ == F_NO_ERROR)
            status_ = pending == F_EOF ? report(header_, file, F_ERR_READ, line) : pending;
        return status_;
    }
    LrecNode* first() const { return head_; }
    // The next record, checked; null (status set) when missing or different.
    LrecNode* next(int32_t type, uint64_t count, int32_t line) {
        if (status_ != F_NO_ERROR) return nullptr;
        if (count > UINT32_MAX) {
            status_ = report(header_, nullptr, F_ERR_SIZE, line);
            return nullptr;
        }
        status_ = grdCheckTypeSize(header_, cursor_, type, static_cast<uint32_t>(count), kModule, line);
        if (status_ != F_NO_ERROR) return nullptr;
        LrecNode* node = cursor_;
        cursor_ = node->next;
        return node;
    }
    // The next record whatever it holds, or null.
    LrecNode* nextAny() {
        LrecNode* node = cursor_;
        if (node != nullptr) cursor_ = node->next;
        return node;
    }
    int32_t status() const { return status_; }

private:
    HeaderHandle header_;
    LrecNode* head_ = nullptr;
    LrecNode* cursor_ = nullptr;
    int32_t status_ = F_NO_ERROR;
};

template <class T>
T valueAt(const LrecNode* node, size_t index = 0) {
    T v;
    std::memcpy(&v, static_cast<const unsigned char*>(node->data) + index * sizeof(T), sizeof(T));
    return v;
}

// Takes over a record's buffer (malloc'd by the record layer, freed by GrdArray).
template <class T>
GrdArray<T> takeArray(LrecNode* node) {
    return GrdArray<T>(static_cast<T*>(rcfLrecDetachData(node)));
}

// The text of a byte record: its bytes up to the first zero, or all of them.
bool assignText(GrdText& out, const LrecNode* node) {
    GrdArray<char> copy = grdAllocArray<char>(int64_t{node->count} + 1);
    if (!copy) return false;
    std::memcpy(copy.get(), node->data, node->count);
    return out.assign(copy.get());
}

template <size_t N>
void copyFixedText(char (&out)[N], const LrecNode* node) {
    std::memset(out, 0, N);
    std::memcpy(out, node->data, node->count < N - 1 ? node->count : N - 1);
}

// Reads an axis block (current or older form) into the item.
int32_t readAxis(HeaderHandle header, GrdItem* item, FileHandle file) {
    bool older = false;
    const int32_t type = axisTypeOfTag(FQueryLogicalBlock(file), &older);
    if (type == 0) {
        rcfGetError(file);  // an end of file met by the query: the missing block is the failure
        return report(header, file, F_ERR_DATA_TYPE, __LINE__);
    }
    const int32_t dirs = axisDirs(type);
    const int32_t skip = older ? 0 : 1;  // the axis unit
    const auto ints = static_cast<uint32_t>(dirs + skip);
    InBlock in(header);
    if (in.read(file, ints > 0 ? RCF_INT4 : 0, ints, __LINE__) != F_NO_ERROR) return in.status();

    GrdItem axis;  // filled first, moved into the item once all is read
    axis.axisType = type;
    // Older files carry no axis unit: their coordinates are taken to be in
    // the first unit of the axis kind's geometry type.
    axis.axisUnit = older ? grdBaseUnit(grdAxisGeometryType(type)) : valueAt<int32_t>(in.first());
    for (int32_t d = 0; d < dirs; ++d) {
        axis.size[d] = valueAt<int32_t>(in.first(), static_cast<size_t>(skip + d));
        if (axis.size[d] < 0) return report(header, file, F_ERR_SIZE, __LINE__);
    }
    if (grdItemFullElements(&axis) > std::numeric_limits<int32_t>::max()) return report(header, file, F_ERR_SIZE, __LINE__);

    switch (grdAxisFamily(type)) {
        case GrdAxisFamily::Equidistant: {
            if (dirs == 0) break;
            const LrecNode* values = in.next(RCF_FLOAT, static_cast<uint64_t>(2 * dirs), __LINE__);
            if (values == nullptr) return in.status();
            if (type == F_EQ_AXIS_D1) {
                axis.step[0] = valueAt<float>(values, 0);  // EqD1 stores its step first
                axis.origin[0] = valueAt<float>(values, 1);
            } else {
                for (int32_t d = 0; d < dirs; ++d) {
                    axis.origin[d] = valueAt<float>(values, static_cast<size_t>(d));
                    axis.step[d] = valueAt<float>(values, static_cast<size_t>(dirs + d));
                }
            }
            break;
        }
        case GrdAxisFamily::NonEquidistant:
            if (type == F_NEQ_AXIS_D1) {
                // Points x, y, z; boundaries from x (see the mapping above).
                const int64_t n = axis.size[0];
                if (n > 0) {
                    LrecNode* points = in.next(RCF_FLOAT, 3 * static_cast<uint64_t>(n), __LINE__);
                    if (points == nullptr) return in.status();
                    axis.diskPoints = takeArray<float>(points);
                    axis.diskPointCount = static_cast<int32_t>(n);
                }
                axis.coords[0] = grdAllocArray<double>(n + 1);
                if (!axis.coords[0]) return report(header, file, F_ERR_MEMORY, __LINE__);
                double* x = axis.coords[0].get();
                for (int64_t i = 0; i < n; ++i) x[i] = axis.diskPoints[3 * i];
                x[n] = n >= 2 ? x[n - 1] + (x[n - 1] - x[n - 2]) : (n == 1 ? x[0] : 0.0);
                break;
            }
            [[fallthrough]];
        case GrdAxisFamily::CurveLinear:
            for (int32_t d = 0; d < dirs; ++d) {
                LrecNode* values = in.next(RCF_DOUBLE, static_cast<uint64_t>(coordValues(type, axis.size, d)), __LINE__);
                if (values == nullptr) return in.status();
                axis.coords[d] = takeArray<double>(values);
            }
            break;
        default:
            break;
    }

    item->axisType = axis.axisType;
    item->axisUnit = axis.axisUnit;
    for (int32_t d = 0; d < 4; ++d) {
        item->size[d] = axis.size[d];
        item->origin[d] = axis.origin[d];
        item->step[d] = axis.step[d];
    }
    for (int32_t d = 0; d < 3; ++d) item->coords[d] = std::move(axis.coords[d]);
    item->diskPoints = std::move(axis.diskPoints);
    item->diskPointCount = axis.diskPointCount;
    return F_NO_ERROR;
}

// Reads a header stream block by block into a header with the defaults.
class HeaderReader {
public:
    HeaderReader(FileHandle file, GrdHeader* header, const GrdApiTrace& trace)
        : file_(file), h_(header), trace_(trace), tail_(&header->customBlocks) {}
    int32_t run();

private:
    int32_t readField(int32_t tag);
    int32_t readTime(int32_t tag);
    int32_t readItemCount();
    int32_t readItem();
    int32_t readStats(GrdItem* item);
    int32_t readAssociations(GrdItem* item);
    int32_t startStats(GrdItem* item);
    int32_t readCustomBlock();
    int32_t skipUnknown(int32_t tag);
    template <class T>
    int32_t readScalar(int32_t type, T* out) {
        InBlock in(h_);
        if (in.read(file_, type, 1, __LINE__) == F_NO_ERROR) *out = valueAt<T>(in.first());
        return in.status();
    }

    FileHandle file_;
    GrdHeader* h_;
    const GrdApiTrace& trace_;
    int32_t cursor_ = 0;                      // 0-based item the next item block fills
    std::unique_ptr<GrdCustomBlock>* tail_;  // where the next custom block goes
};

int32_t HeaderReader::run() {
    for (;;) {
        const int32_t tag = FQueryLogicalBlock(file_);
        trace_.print("tag=%d", tag);
        int32_t status = F_NO_ERROR;
        switch (tag) {
            case kTagHeaderStart:
            case kTagTimeStart:
            case kTagItemStart:
                status = FSkipLogicalBlock(file_);
                rcfGetError(file_);  // taken: it is the status
                break;
            case kTagStaticStart:
            case kTagDynamicStart:
                // The data sections begin here; the block stays for their readers.
                return cursor_ < h_->noOfItems ? report(h_, file_, F_ERR_DATA_TYPE, __LINE__) : F_NO_ERROR;
            case kTagItemCount: status = readItemCount(); break;
            case kTagItem:
            case kTagItemText: status = readItem(); break;
            case kTagCustomBlock: status = readCustomBlock(); break;
            default:
                if (tag > kTagHeaderStart && tag <= kTagCompressed) {
                    status = readField(tag);
                } else if (isTimeTag(tag)) {
                    status = readTime(tag);
                } else {
                    status = skipUnknown(tag);
                }
                break;
        }
        if (status != F_NO_ERROR) return status;
    }
}

int32_t HeaderReader::skipUnknown(int32_t tag) {
    trace_.print("Unknown file tag found");
    if (tag == 0 && rcfPeekError(file_) == F_EOF) {
        // The stream ended without a data section: no block to skip.
        rcfGetError(file_);
        return report(h_, file_, F_ERR_NOT_BLOCK, __LINE__);
    }
    const int32_t status = FSkipLogicalBlock(file_);
    rcfGetError(file_);
    return status;
}

int32_t HeaderReader::readField(int32_t tag) {
    switch (tag) {
        case kTagFileTitle:
        case kTagAppTitle:
        case kTagProjection: {
            InBlock in(h_);
            if (in.read(file_, RCF_BYTE, 0, __LINE__) != F_NO_ERROR) return in.status();
            GrdText* text = &h_->projection;
            if (tag == kTagProjection) {
                const LrecNode* origin = in.next(RCF_DOUBLE, 3, __LINE__);
                if (origin == nullptr) return in.status();
                h_->geoInfoType = F_UTM_PROJECTION;
                h_->longitude = valueAt<double>(origin, 0);
                h_->latitude = valueAt<double>(origin, 1);
                h_->orientation = valueAt<double>(origin, 2);
            } else {
                text = tag == kTagFileTitle ? &h_->fileTitle : &h_->appTitle;
            }
            return assignText(*text, in.first()) ? F_NO_ERROR : report(h_, file_, F_ERR_MEMORY, __LINE__);
        }
        case kTagFileType: {
            int16_t fileType = 0;
            const int32_t status = readScalar(RCF_INT2, &fileType);
            h_->fileType = fileType;
            return status;
        }
        case kTagAppVersion: return readScalar(RCF_INT4, &h_->appVersionNo);
        case kTagDataType: return readScalar(RCF_INT4, &h_->dataType);
        case kTagCompressed: return readScalar(RCF_INT4, &h_->fileCompressed);
        case kTagStatsType: return readScalar(RCF_INT4, &h_->statsType);
        case kTagDeleteFloat: {
            const int32_t status = readScalar(RCF_FLOAT, &h_->deleteValFloat);
            file_->deleteValFloat = h_->deleteValFloat;
            return status;
        }
        case kTagDeleteDouble: {
            const int32_t status = readScalar(RCF_DOUBLE, &h_->deleteValDouble);
            file_->deleteValDouble = h_->deleteValDouble;
            return status;
        }
        case kTagDeleteByte: return readScalar(RCF_BYTE, &h_->deleteValByte);
        case kTagDeleteInt: return readScalar(RCF_INT4, &h_->deleteValInt);
        case kTagDeleteUnsigned: return readScalar(RCF_UINT4, &h_->deleteValUnsignedInt);
        default: return skipUnknown(tag);
    }
}

int32_t HeaderReader::readTime(int32_t tag) {
    const bool older = tag < kTagTime;
    const int32_t kind = timeKindOfTag(tag);
    const bool calendar = kind == F_CAL_EQ_AXIS || kind == F_CAL_NEQ_AXIS;
    const int32_t unitType = older ? RCF_BYTE : RCF_INT4;
    const uint32_t unitCount = older ? 0 : 1;
    InBlock in(h_);
    const LrecNode* date = nullptr;
    const LrecNode* time = nullptr;
    const LrecNode* unit = nullptr;
    if (calendar) {
        if (in.read(file_, RCF_BYTE, 0, __LINE__) != F_NO_ERROR) return in.status();
        date = in.first();
        time = in.next(RCF_BYTE, 0, __LINE__);
        unit = in.next(unitType, unitCount, __LINE__);
    } else {
        if (in.read(file_, unitType, unitCount, __LINE__) != F_NO_ERROR) return in.status();
        unit = in.first();
    }
    const LrecNode* times = in.next(RCF_DOUBLE, 2, __LINE__);
    const LrecNode* counters = in.next(RCF_INT4, 2, __LINE__);
    if (in.status() != F_NO_ERROR) return in.status();
    if (valueAt<int32_t>(counters, 0) < 0) return report(h_, file_, F_ERR_SIZE, __LINE__);

    GrdTimeAxis& axis = h_->timeAxis;
    axis.type = kind;
    GrdTimeValues& v = calendar ? axis.calendar : axis.time;
    if (calendar) {
        copyFixedText(axis.startDate, date);
        copyFixedText(axis.startTime, time);
    }
    if (older) {
        // The unit is known only by its text.
        v.unit = -1;
        if (!assignText(v.unitText, unit)) return report(h_, file_, F_ERR_MEMORY, __LINE__);
    } else {
        v.unit = valueAt<int32_t>(unit);
        v.unitText.reset();
    }
    v.start = valueAt<double>(times, 0);
    v.step = valueAt<double>(times, 1);
    v.timeSteps = valueAt<int32_t>(counters, 0);
    v.firstIndex = valueAt<int32_t>(counters, 1);
    return F_NO_ERROR;
}

int32_t HeaderReader::readItemCount() {
    int32_t n = 0;
    const int32_t status = readScalar(RCF_INT4, &n);
    if (status != F_NO_ERROR) return status;
    // Every item takes at least kMinItemBytes: a count that the rest of the
    // file cannot hold is refused before anything is allocated for it.
    if (n < 0 || int64_t{n} * kMinItemBytes > remainingBytes(file_)) return report(h_, file_, F_ERR_SIZE, __LINE__);
    if (grdHeaderAllocItems(h_, n) != F_NO_ERROR) return report(h_, file_, F_ERR_MEMORY, __LINE__);
    cursor_ = 0;
    return F_NO_ERROR;
}

int32_t HeaderReader::readItem() {
    // More item blocks than the item count announced.
    if (cursor_ >= h_->noOfItems) return report(h_, file_, F_ERR_SIZE, __LINE__);
    GrdItem* item = &h_->items[cursor_];
    int32_t status = grdReadItemRecord(h_, item, file_);
    bool hasStats = false;
    while (status == F_NO_ERROR) {
        const int32_t tag = FQueryLogicalBlock(file_);
        if (tag == kTagElemStats) {
            status = readStats(item);
            hasStats = true;
        } else if (tag == kTagAssocStatic) {
            status = readAssociations(item);
        } else {
            break;
        }
    }
    if (status == F_NO_ERROR && !hasStats) status = startStats(item);
    item->owner = h_;
    ++cursor_;
    return status;
}

int32_t HeaderReader::readStats(GrdItem* item) {
    InBlock in(h_);
    if (in.read(file_, 0, 0, __LINE__) != F_NO_ERROR) return in.status();
    LrecNode* values = in.nextAny();  // none for an item of no elements
    if (values != nullptr) {
        const int32_t status = grdCheckTypeSize(h_, values, RCF_DOUBLE, 0, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
    }
    // Nine doubles per element. A compressed file holds them per element of
    // its key, whose length is known only once the static items are read:
    // then any whole number of records up to the item's elements fits.
    const uint64_t count = values != nullptr ? values->count : 0;
    const int64_t full = grdItemFullElements(item);
    const uint64_t expected = 9 * static_cast<uint64_t>(full > 0 ? full : 0);
    const bool fits = count == expected || (h_->fileCompressed != 0 && count % 9 == 0 && count <= expected);
    if (!fits) return report(h_, file_, F_ERR_SIZE, __LINE__);
    item->elemStats = values != nullptr ? takeArray<GrdElementStats>(values) : grdAllocArray<GrdElementStats>(0);
    item->elemStatsCount = static_cast<int32_t>(count / 9);
    return item->elemStats ? F_NO_ERROR : report(h_, file_, F_ERR_MEMORY, __LINE__);
}

// Per-element statistics of an item whose file holds none although the
// statistics type asks for them: they start afresh, as for a new item, but
// only for a size that the rest of the file could plausibly describe. The
// item's summary read from the file is kept.
int32_t HeaderReader::startStats(GrdItem* item) {
    if (h_->statsType != F_ITEM_STATS_ELEMENT && h_->statsType != F_ITEM_STATS_ELEMENT_ALT) return F_NO_ERROR;
    const int64_t elements = grdItemElementCount(item);
    if (elements > remainingBytes(file_) / static_cast<int64_t>(sizeof(GrdElementStats)))
        return report(h_, file_, F_ERR_SIZE, __LINE__);
    const double summary[3] = {item->globalMax, item->globalMin, item->globalDeletes};
    const int32_t status = grdItemInitStatistics(h_, item, kModule, __LINE__);
    item->globalMax = summary[0];
    item->globalMin = summary[1];
    item->globalDeletes = summary[2];
    return status;
}

int32_t HeaderReader::readAssociations(GrdItem* item) {
    InBlock in(h_);
    if (in.read(file_, 0, 0, __LINE__) != F_NO_ERROR) return in.status();
    const LrecNode* numbers = in.nextAny();
    if (numbers != nullptr) {
        const int32_t status = grdCheckTypeSize(h_, numbers, RCF_UINT4, 0, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
    }
    // Kept as stored, zeros included, so that every number is written back.
    const int32_t status = tova::guarded([&] {
        item->assocStatic.clear();
        if (numbers != nullptr) {
            const auto* first = static_cast<const int32_t*>(numbers->data);
            item->assocStatic.assign(first, first + numbers->count);
        }
        return static_cast<int32_t>(F_NO_ERROR);
    });
    return status == F_NO_ERROR ? status : report(h_, file_, status, __LINE__);
}

int32_t HeaderReader::readCustomBlock() {
    InBlock in(h_);
    if (in.read(file_, RCF_BYTE, 0, __LINE__) != F_NO_ERROR) return in.status();
    LrecNode* data = in.nextAny();  // none for a block of no values
    if (data != nullptr && data->count > static_cast<uint32_t>(std::numeric_limits<int32_t>::max()))
        return report(h_, file_, F_ERR_SIZE, __LINE__);
    GrdCustomBlock* block = grdNew<GrdCustomBlock>();
    if (block == nullptr) return report(h_, file_, F_ERR_MEMORY, __LINE__);
    tail_->reset(block);
    tail_ = &block->next;
    if (data != nullptr) {
        block->type = data->type;
        block->count = static_cast<int32_t>(data->count);
        block->data = takeArray<unsigned char>(data);
    }
    return assignText(block->name, in.first()) ? F_NO_ERROR : report(h_, file_, F_ERR_MEMORY, __LINE__);
}

}  // namespace

int32_t grdReadItemRecord(HeaderHandle header, GrdItem* item, FileHandle file) {
    if (item == nullptr || file == nullptr) return report(header, file, F_ERR_ARGUMENT, __LINE__);
    const int32_t tag = FQueryLogicalBlock(file);
    if (tag != kTagItem && tag != kTagItemText) {
        rcfGetError(file);  // an end of file met by the query: the missing block is the failure
        return report(header, file, F_ERR_DATA_TYPE, __LINE__);
    }
    const bool unitAsText = tag == kTagItemText;
    {
        InBlock in(header);
        if (in.read(file, RCF_INT4, 1, __LINE__) != F_NO_ERROR) return in.status();
        const LrecNode* name = in.next(RCF_BYTE, 0, __LINE__);
        const LrecNode* unit = unitAsText ? in.next(RCF_BYTE, 0, __LINE__) : in.next(RCF_INT4, 1, __LINE__);
        const LrecNode* dataType = in.next(RCF_INT4, 1, __LINE__);
        const LrecNode* summary = in.next(RCF_DOUBLE, 3, __LINE__);
        const LrecNode* ref = in.next(RCF_FLOAT, 3, __LINE__);
        const LrecNode* orientation = in.next(RCF_FLOAT, 3, __LINE__);
        if (in.status() != F_NO_ERROR) return in.status();

        grdItemReset(item);
        item->itemType = valueAt<int32_t>(in.first());
        bool ok = assignText(item->name, name);
        if (unitAsText) {
            item->unit = -1;
            ok = assignText(item->unitText, unit) && ok;
        } else {
            item->unit = valueAt<int32_t>(unit);
        }
        item->dataType = valueAt<int32_t>(dataType);
        item->globalMax = valueAt<double>(summary, 0);
        item->globalMin = valueAt<double>(summary, 1);
        item->globalDeletes = valueAt<double>(summary, 2);
        item->refX = valueAt<float>(ref, 0);
        item->refY = valueAt<float>(ref, 1);
        item->refZ = valueAt<float>(ref, 2);
        item->alpha = valueAt<float>(orientation, 0);
        item->phi = valueAt<float>(orientation, 1);
        item->theta = valueAt<float>(orientation, 2);
        if (!ok) return report(header, file, F_ERR_MEMORY, __LINE__);
    }
    // Older files have no value type: it stays 0.
    if (FQueryLogicalBlock(file) == kTagValueType) {
        InBlock in(header);
        if (in.read(file, RCF_INT4, 1, __LINE__) != F_NO_ERROR) return in.status();
        item->valueType = valueAt<int32_t>(in.first());
    }
    return readAxis(header, item, file);
}

HeaderHandle grdReadHeader(FileHandle file, int32_t* status) {
    GrdApiTrace trace("grdReadHeader");
    int32_t code = grdCheckFile(file, kModule, __LINE__);
    std::unique_ptr<GrdHeader> header;
    if (code == F_NO_ERROR) {
        header.reset(grdHeaderNew());
        if (!header) code = report(nullptr, file, F_ERR_MEMORY, __LINE__);
    }
    if (code == F_NO_ERROR) {
        file->ownerMark = 1;
        code = HeaderReader(file, header.get(), trace).run();
        if (code == F_NO_ERROR) file->headerEnd = rcfTell64(file);
    }
    if (code != F_NO_ERROR) header.reset();  // a header that failed is never handed out
    else grdBindFile(header.get(), file);
    if (status != nullptr) *status = code;
    trace.done(code);
    return header.release();
}

// ---- In-place updates -------------------------------------------------------------------------------
// A header already on disk is brought up to date through a second handle
// on the same file: each block is read as it stands, filled afresh from
// the header (texts keep their stored length) and written back at its own
// position, giving the bytes that grdWriteHeader would write. A block whose
// size would change (an item whose axis kind or sizes changed, a projection
// the header no longer has, a custom block of another count) is left as it
// is: writing it would overwrite the blocks after it.

namespace {

// Rewrites a block of the image. fill(block, old) fills the new block from
// the header and returns false to leave the old one as it is.
template <class Fill>
int32_t rewriteBlock(HeaderHandle header, GrdStreamImage& image, const GrdStreamImage::Block& at, Fill fill) {
    OutBlock block(header, at.records);
    if (!fill(block, at.records) || block.status() != F_NO_ERROR) return block.status();
    if (block.sameShape(at.records)) image.replace(at, block.records());  // else its size would change: left
    return F_NO_ERROR;
}

// Brings the header's time-axis counters up to date (the number of time
// steps written; for the non-equidistant kinds the span to the last time
// written) and rewrites the time block at pos in the form the file holds.
int32_t rewriteTimeBlock(HeaderHandle header, FileHandle edit, GrdStreamImage& image, const GrdStreamImage::Block& at) {
    const int32_t tag = at.tag;
    GrdTimeValues* v = grdTimeAxisValues(header);
    const int32_t kind = timeKindOfTag(tag);
    if (header->timeAxis.type != kind || v == nullptr) return report(header, edit, F_ERR_VALUE, __LINE__);
    if (header->timeStepsDone > v->timeSteps) v->timeSteps = header->timeStepsDone;
    if ((kind == F_TM_NEQ_AXIS || kind == F_CAL_NEQ_AXIS) && header->largestTime != F_DELETE_VALUE_DOUBLE)
        v->step = header->largestTime - v->start;
    return rewriteBlock(header, image, at, [&](OutBlock& b, const LrecNode*) {
        fillTimeBlock(header, tag, b);
        return true;
    });
}

// The custom block that the k-th 60000 block of a file stands for: the
// k-th of the chain when it has the block's name (blocks of one name keep
// their order), else the first of that name; null when none has it.
const GrdCustomBlock* customBlockFor(const GrdHeader* h, int32_t k, const LrecNode* name) {
    if (name == nullptr || name->type != RCF_BYTE) return nullptr;
    const auto* bytes = static_cast<const char*>(name->data);
    const void* zero = std::memchr(bytes, 0, name->count);
    const size_t length = zero != nullptr ? static_cast<size_t>(static_cast<const char*>(zero) - bytes) : name->count;
    const auto named = [&](const GrdCustomBlock* c) {
        return c->name.length() == length && std::memcmp(c->name.orEmpty(), bytes, length) == 0;
    };
    const GrdCustomBlock* c = h->customBlocks.get();
    for (int32_t i = 1; c != nullptr && i < k; ++i) c = c->next.get();
    if (c != nullptr && named(c)) return c;
    for (c = h->customBlocks.get(); c != nullptr; c = c->next.get())
        if (named(c)) return c;
    return nullptr;
}

// Whether an axis block as stored (its first record: the axis unit unless
// older, then the sizes) holds the item's sizes.
bool sameSizes(const GrdItem* item, bool older, const LrecNode* stored) {
    const int32_t dirs = axisDirs(item->axisType);
    const int32_t skip = older ? 0 : 1;
    if (dirs + skip == 0) return true;
    if (stored == nullptr || stored->type != RCF_INT4 || stored->count != static_cast<uint32_t>(dirs + skip)) return false;
    for (int32_t d = 0; d < dirs; ++d)
        if (valueAt<int32_t>(stored, static_cast<size_t>(skip + d)) != item->size[d]) return false;
    return true;
}

bool isRewrittenField(int32_t tag) {
    return tag == kTagFileTitle || tag == kTagAppTitle || tag == kTagAppVersion ||
           (tag >= kTagDeleteFloat && tag <= kTagDataType);
}

// One full scan of the header blocks (grdUpdateHeader), in the image of the
// header stream; the bytes that changed go back in one transfer, also when
// the scan failed (the blocks before the failure are rewritten).
int32_t rewriteHeaderBlocks(HeaderHandle header, FileHandle edit, GrdStreamImage& image, const GrdApiTrace& trace) {
    int32_t itemNo = 0;    // the item of the last item block met (0: none yet)
    int32_t customNo = 0;  // 60000 blocks met
    for (;;) {
        GrdStreamImage::Block at;
        int32_t status = image.next(at);
        if (status != F_NO_ERROR) return report(header, edit, status, __LINE__);
        const int32_t tag = at.tag;
        if (tag == kTagStaticStart || tag == kTagDynamicStart) return F_NO_ERROR;
        if (tag == 0) {
            trace.print("Zero tag found, end of file, corrupt file");
            return F_NO_ERROR;
        }
        if (tag == kTagItem || tag == kTagItemText) ++itemNo;
        const GrdItem* item = grdHeaderItem(header, itemNo);
        bool older = false;
        if (isRewrittenField(tag)) {
            status = rewriteBlock(header, image, at, [&](OutBlock& b, const LrecNode*) {
                // A projection that the header no longer has stays as it is.
                return (tag != kTagProjection || header->geoInfoType == F_UTM_PROJECTION) &&
                       fillHeaderField(header, tag, b);
            });
        } else if (isTimeTag(tag)) {
            status = rewriteTimeBlock(header, edit, image, at);
        } else if (item != nullptr && (tag == kTagItem || tag == kTagItemText)) {
            status = rewriteBlock(header, image, at, [&](OutBlock& b, const LrecNode*) {
                // An item whose unit changed between key and text needs the other block.
                const bool unitAsText = tag == kTagItemText;
                if (unitAsText != (item->unit < 0)) return false;
                fillItemBlock(item, unitAsText, b);
                return true;
            });
        } else if (item != nullptr && tag == kTagValueType) {
            status = rewriteBlock(header, image, at, [&](OutBlock& b, const LrecNode*) {
                b.value(RCF_INT4, item->valueType);
                return true;
            });
        } else if (item != nullptr && axisTypeOfTag(tag, &older) != 0) {
            status = rewriteBlock(header, image, at, [&](OutBlock& b, const LrecNode* old) {
                // Another axis kind or other sizes: the item's data on disk
                // are laid out by the stored axis, which therefore stays.
                if (axisTagOf(item->axisType, older) != tag || !sameSizes(item, older, old)) return false;
                fillAxisBlock(header, item, older, b);
                return true;
            });
        } else if (item != nullptr && tag == kTagElemStats) {
            status = rewriteBlock(header, image, at, [&](OutBlock& b, const LrecNode* old) {
                // Only a stored block of the same size is replaced: building
                // one of another size would be wasted (it is left as it is),
                // and a damaged header could make it gigabytes large.
                const int64_t used = std::max<int64_t>(grdItemUsedElementCount(item), 0);
                if (old == nullptr || old->type != RCF_DOUBLE || static_cast<int64_t>(old->count) != 9 * used)
                    return false;
                fillStatsBlock(header, item, b);
                return true;
            });
        } else if (tag == kTagCustomBlock) {
            ++customNo;
            status = rewriteBlock(header, image, at, [&](OutBlock& b, const LrecNode* old) {
                const GrdCustomBlock* c = customBlockFor(header, customNo, old);
                if (c == nullptr) return false;
                fillCustomBlock(c, b);
                return true;
            });
        } else {
            // Section starts, the item count, file type, statistics type,
            // compressed flag, associations and whatever else is not ours.
            trace.print("Unknown tag found %d", tag);
        }
        if (status != F_NO_ERROR) return status;
    }
}

// One scan for the time block (grdUpdateHeaderTime).
int32_t rewriteTimeOnly(HeaderHandle header, FileHandle edit, GrdStreamImage& image, const GrdApiTrace& trace) {
    for (;;) {
        GrdStreamImage::Block at;
        const int32_t status = image.next(at);
        if (status != F_NO_ERROR) return report(header, edit, status, __LINE__);
        if (isTimeTag(at.tag)) return rewriteTimeBlock(header, edit, image, at);
        if (at.tag == kTagStaticStart || at.tag == kTagDynamicStart) return F_NO_ERROR;
        if (at.tag == 0) {
            trace.print("Zero tag found, end of file, corrupt file");
            return F_NO_ERROR;
        }
        trace.print("Unknown tag found %d", at.tag);
    }
}

// Hands the bytes the stream holds to the system. A failure stays the
// file's error: the C library drops bytes it could not write, so nothing
// may be written after them (the layout would shift).
int32_t pushToSystem(HeaderHandle header, FileHandle file) {
    if (file->readOnly != 0 || file->stream == nullptr || file->lastOp >= 0) return F_NO_ERROR;
    if (std::fflush(file->stream) == 0) return F_NO_ERROR;
    if (file->error == F_NO_ERROR || file->error == F_EOF) file->error = F_ERR_FLUSH;
    return report(header, file, F_ERR_FLUSH, __LINE__);
}

// The frame of both updates: checks, the flush (always), the one-second
// throttle, the second handle positioned at appBase with the image of the
// header stream, the scan, the write of what changed, and the close of the
// second handle.
template <class Scan>
int32_t runUpdate(HeaderHandle header, int32_t force, FileHandle file, const GrdApiTrace& trace, int64_t hint,
                  Scan scan) {
    int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
    if (status != F_NO_ERROR) return status;
    status = pushToSystem(header, file);
    if (status != F_NO_ERROR) return status;
    // Without force at most one rewrite a second: openClock holds the time
    // of the file's last header update in monotonic milliseconds.
    const uint32_t now = rcfClockMs();
    if (force == 0 && static_cast<uint32_t>(now - file->openClock) / 1000.0 <= 1.0) return F_NO_ERROR;
    if (file->readOnly != 0) return report(header, file, F_ERR_READONLY, __LINE__);
    file->openClock = now;

    // The second handle renews the edit stamp of the record-file header.
    int32_t openStatus = F_NO_ERROR;
    FileHandle edit = FOpenFileEdit(file->filname, &openStatus);
    if (edit == nullptr) return openStatus != F_NO_ERROR ? openStatus : report(header, file, F_ERR_OPEN, __LINE__);
    rcfSeekAppBase(edit);
    status = rcfGetError(edit);
    if (status != F_NO_ERROR) report(header, edit, status, __LINE__);
    trace.print("while_loop starts here");
    if (status == F_NO_ERROR) {
        GrdStreamImage image(edit, hint);
        status = scan(edit, image);
        const int32_t stored = image.store();
        if (stored != F_NO_ERROR) report(header, edit, stored, __LINE__);
        if (status == F_NO_ERROR) status = stored;
    }
    trace.print("ends here");
    // Closed in every case; a failed close counts when all else went well.
    const int32_t closed = FCloseFile(&edit);
    return status != F_NO_ERROR ? status : closed;
}

}  // namespace

int32_t grdUpdateHeaderTime(HeaderHandle header, int32_t force, FileHandle file) {
    GrdApiTrace trace("grdUpdateHeaderTime");
    return trace.done(runUpdate(header, force, file, trace, 0, [&](FileHandle edit, GrdStreamImage& image) {
        return rewriteTimeOnly(header, edit, image, trace);
    }));
}

int32_t grdUpdateHeader(HeaderHandle header, int32_t force, FileHandle file) {
    GrdApiTrace trace("grdUpdateHeader");
    // The whole stream is read at once when its length is known, with the
    // mark of the block after it.
    const int64_t hint = file != nullptr && file->headerEnd > 0 ? file->headerEnd - file->appBase + 3 : 0;
    return trace.done(runUpdate(header, force, file, trace, hint, [&](FileHandle edit, GrdStreamImage& image) {
        file->deleteValFloat = header->deleteValFloat;
        file->deleteValDouble = header->deleteValDouble;
        return rewriteHeaderBlocks(header, edit, image, trace);
    }));
}
