// Gridded data-file layer, internal model of a header: the header record, its
// items, custom blocks and time axis, the argument checks with which every
// API function begins, the zeroed allocation, and the helpers that the
// persistence, lifecycle, data and plug-in code share with the setters.
//
// Ownership: every string and array below is owned by the record holding it
// and freed by its destructor; what the API lends out points into them. A
// null text reads as "" wherever a text is written or given out.
#pragma once

#include <cstdint>
#include <cstdlib>
#include <memory>
#include <vector>

#include "tova/grd.h"
#include "tova/trace.h"
#include "trace/trace_internal.h"

// ---- Module names of the reports --------------------------------------------

inline constexpr const char* kModGrdHeader = "..\\grd\\grdheader";
inline constexpr const char* kModGrdIo = "..\\grd\\grdio";
inline constexpr const char* kModGrdItem = "..\\grd\\grditem";
inline constexpr const char* kModGrdTimeAxis = "..\\grd\\grdtimeaxis";

// ---- Allocation ----------------------------------------------------------------

// Every allocation of the header model goes through grdAllocRaw (or the
// nothrow constructions below), so that a test can make the n-th one fail.
void* grdAllocRaw(size_t bytes) noexcept;  // zero-filled; null on failure
// Test hook: the n-th allocation from now fails (1 = the next); 0 disarms.
// The countdown covers the record layer's allocations as well.
void grdTestFailAllocation(int32_t nth) noexcept;
// Consumes one allocation of the test hook; true when it is to fail.
bool grdAllocationFails() noexcept;

struct GrdFree {
    void operator()(void* p) const noexcept { std::free(p); }
};
// An owned, zero-initialised C array (allocated with grdAllocRaw).
template <class T>
using GrdArray = std::unique_ptr<T[], GrdFree>;

// A zeroed array of count elements; null when count is negative, the byte
// count overflows, or memory fails. A count of 0 gives a valid empty array.
template <class T>
GrdArray<T> grdAllocArray(int64_t count) noexcept {
    if (count < 0 || static_cast<uint64_t>(count) > SIZE_MAX / sizeof(T)) return GrdArray<T>();
    return GrdArray<T>(static_cast<T*>(grdAllocRaw(static_cast<size_t>(count) * sizeof(T))));
}

// nothrow construction that honours the test hook.
template <class T>
T* grdNew() noexcept {
    return grdAllocationFails() ? nullptr : new (std::nothrow) T();
}
template <class T>
std::unique_ptr<T[]> grdNewArray(int64_t count) noexcept {
    if (count < 0 || static_cast<uint64_t>(count) > SIZE_MAX / sizeof(T) || grdAllocationFails()) return nullptr;
    return std::unique_ptr<T[]>(new (std::nothrow) T[static_cast<size_t>(count)]);
}

// An owned NUL-terminated text: null, or a copy. Empty texts share one static
// buffer and never allocate.
class GrdText {
public:
    GrdText() = default;
    const char* get() const noexcept { return p_.get(); }
    const char* orEmpty() const noexcept { return p_ ? p_.get() : ""; }
    bool isNull() const noexcept { return p_ == nullptr; }
    size_t length() const noexcept;
    // Replaces the text by a copy of text (null stores null). When memory
    // fails the text becomes null and false is returned. text may point into
    // the current value.
    bool assign(const char* text) noexcept;
    // Copies text over the stored one without changing its length: a shorter
    // text is padded with blanks, a longer one cut.
    void overwriteKeepLength(const char* text) noexcept;
    void reset() noexcept { p_.reset(); }

private:
    struct Free {
        void operator()(char* p) const noexcept;
    };
    std::unique_ptr<char, Free> p_;
};

// ---- Items -------------------------------------------------------------------

// Per-element statistics record (one per element of every item when the header's
// statistics type is 2 or 3), nine doubles in this order.
struct GrdElementStats {
    double max;
    double min;
    double sum;
    double sumSquares;
    double lagSum;    // sum of value x previous value
    double previous;  // delete value breaks the lag-one chain
    double values;    // number of values
    double pairs;     // number of lag-one pairs
    double deletes;   // number of delete values
};
static_assert(sizeof(GrdElementStats) == 9 * sizeof(double));

// Axis kinds by family.
enum class GrdAxisFamily { Undefined, Equidistant, NonEquidistant, CurveLinear, TimeVarying };
GrdAxisFamily grdAxisFamily(int32_t axisType) noexcept;

// One item record. A static item (defined by the static-item module) derives
// from it and sets isStatic; the item operations serve both.
struct GrdItem {
    GrdText name;
    int32_t itemType = 0;  // quantity type key of the unit library
    GrdText unitText;      // unit as text (grdSetItemInfo_, older files); may be null
    int32_t unit = 0;      // unit key; -1 when only the text is known
    int32_t dataType = 0;  // simple type of the values, 1-7

    // Item-global statistics: maximum, minimum, number of delete values (the
    // order in which they are stored in the item block).
    double globalMax = 0.0;
    double globalMin = 0.0;
    double globalDeletes = 0.0;

    int32_t axisType = 0;  // ItemAxisType
    int32_t axisUnit = 0;  // unit of the axis coordinates
    // Sizes x, y, z, t; for the equidistant kinds the origins and steps per
    // direction ("item order": all origins, then all steps); for the
    // non-equidistant and curvilinear kinds one coordinate array per
    // direction (size + 1 boundaries, or one value per node), always owned.
    int32_t size[4] = {0, 0, 0, 0};
    float origin[4] = {0, 0, 0, 0};
    float step[4] = {0, 0, 0, 0};
    GrdArray<double> coords[3];
    // NeqD1 on disk holds x, y, z per point (3 x size floats) where the model
    // keeps size + 1 x boundaries: the points of an axis read from a file are
    // kept here (diskPointCount points) so that a rewrite gives back their y
    // and z. Null for an axis set in memory; cleared by every axis setter.
    GrdArray<float> diskPoints;
    int32_t diskPointCount = 0;

    int32_t axisConvMode = 0;  // axis unit conversion (set and get of axis values)
    int32_t axisConvUnit = 0;
    int32_t valueType = 0;
    GrdHeader* owner = nullptr;  // set by the info setters
    int32_t isStatic = 0;        // kept when the item is reset
    int32_t itemConvMode = 0;    // unit conversion of the data on read and write
    int32_t itemConvUnit = 0;
    float refX = 0, refY = 0, refZ = 0;
    float alpha = 0, phi = 0, theta = 0;

    GrdArray<GrdElementStats> elemStats;  // null when the statistics type is 1
    int32_t elemStatsCount = 0;           // records in elemStats
    std::vector<int32_t> assocStatic;     // static associations in order

    GrdItem() = default;
    GrdItem(GrdItem&&) = default;
    GrdItem& operator=(GrdItem&&) = default;
    virtual ~GrdItem() = default;  // static items are freed through their own type
};

// Item initialisation at header creation (and for a fresh static item):
// cleared record, empty name and unit text, references and orientation set to
// deleteValue. Keeps the statistics and associations.
void grdItemInit(GrdItem* item, float deleteValue) noexcept;
// Item reset at the start of each info setter: frees texts and coordinate
// arrays, clears the record but for the statistics, the associations and the
// static flag; references and orientation become -1e-35.
void grdItemReset(GrdItem* item) noexcept;
// Statistics initialisation: a fresh per-element array for statistics types
// 2 and 3 (none for 1), global min/max at the double delete value. 2010 for
// another type or an element count beyond int32; 2000 when memory fails.
// Reports through the dispatcher with the given module and line.
int32_t grdItemInitStatistics(GrdHeader* header, GrdItem* item, const char* module, int32_t line) noexcept;

// Element counts in 64 bits, never reported: -1 when the axis kind has none
// (undefined or unknown axis type) or a size is negative.
// They are inline (after GrdHeader below): every write and read of a time
// step asks for them.
inline int64_t grdItemFullElements(const GrdItem* item) noexcept;      // the XYZ size
inline int64_t grdItemElementCount(const GrdItem* item) noexcept;      // grdGetItemElements
inline int64_t grdItemUsedElementCount(const GrdItem* item) noexcept;  // grdGetUsedItemElements
// Values held by coordinate array d (0-2) of the item's axis: size + 1
// boundaries (non-equidistant), one per node (curvilinear), else 0.
int64_t grdItemCoordinateCount(const GrdItem* item, int32_t d) noexcept;
// Makes to a deep copy of from (texts, coordinate arrays, points read from
// the file, element statistics, associations); false when memory fails (to
// is then partly filled and still destroyable). Copies every field above:
// keep it in step when a field is added.
bool grdItemCopy(GrdItem* to, const GrdItem* from) noexcept;
// Element width of simple types 1-7, else 0.
int32_t grdSimpleTypeSize(int32_t simpleType) noexcept;
// Quantity type of an axis kind (100185-100188, else 999).
int32_t grdAxisGeometryType(int32_t axisType) noexcept;
// First unit of a quantity type's unit list (0 when the unit library has none).
int32_t grdBaseUnit(int32_t itemType) noexcept;
// Text of a unit key from the unit library; else the stored text, whose unit
// key is then looked up into *unit (when unit is given); else "".
const char* grdUnitText(int32_t unitKey, const GrdText& stored, int32_t* unit) noexcept;

// ---- Custom blocks -------------------------------------------------------------

struct GrdCustomBlock {
    int32_t type = 0;  // simple type
    GrdText name;
    int32_t count = 0;
    GrdArray<unsigned char> data;  // count x width bytes for types 1-7, else null
    std::unique_ptr<GrdCustomBlock> next;
    ~GrdCustomBlock();  // releases the rest of the chain without recursion
};

// ---- Time axis -------------------------------------------------------------------

// The fields of one time-axis family. Time-value axes (types 1, 2) and
// calendar axes (3, 4) keep separate sets.
struct GrdTimeValues {
    GrdText unitText;        // set only by the header reader (older files); freed by every setter
    int32_t unit = 0;        // time unit key
    double start = 0.0;      // start time (1, 2) or start time offset (3, 4)
    double step = 0.0;       // time step (1, 3); span as stored in the file (2, 4)
    int32_t timeSteps = 0;   // number of time steps, kept by the file layer
    int32_t firstIndex = 0;  // index of the first stored time step
};

struct GrdTimeAxis {
    int32_t type = 0;  // TimeAxisType
    GrdTimeValues time;
    char startDate[11] = {};  // "yyyy-mm-dd"
    char startTime[9] = {};   // "hh:mm:ss"
    char outDate[11] = {};    // what the calendar getters give out
    char outTime[9] = {};
    GrdTimeValues calendar;
};
// The field set of the header's time-axis type; null when it is not 1-4.
GrdTimeValues* grdTimeAxisValues(GrdHeader* header) noexcept;

// Proleptic Gregorian date arithmetic of the calendar axes. Fields out of
// their range carry over (month 13 is January of the next year, second 75 is
// 1:15), so every text that passes the date and time rules converts.
struct GrdDateTime {
    int32_t year, month, day, hour, minute, second;
};
// Seconds since 1970-01-01 00:00:00 (negative before).
int64_t grdDateTimeToSeconds(const GrdDateTime& t) noexcept;
// The inverse, with every field in its range (year may be negative or beyond
// 9999 for extreme counts; |seconds| must stay below about 6e16).
GrdDateTime grdSecondsToDateTime(int64_t seconds) noexcept;

// ---- Header ------------------------------------------------------------------------

// State that another module keeps in the header (legacy translator, plug-in
// loader). The header only owns it: its destructor calls release(header) once
// when set; release frees data and clears the fields.
struct GrdAttachedState {
    void* data = nullptr;
    void (*release)(GrdHeader* header) = nullptr;
};

// A number that no other header of the process has had (never 0).
uint64_t grdNextHeaderSerial() noexcept;

struct GrdHeader {
    // Identifies this header to the files created with it or read into it
    // (RcfFile::headerSerial); unlike the address, never reused.
    const uint64_t serial = grdNextHeaderSerial();
    int32_t fileType = 0;
    GrdText fileTitle;
    GrdText appTitle;
    int32_t appVersionNo = 0;
    int32_t dataType = 0;
    int32_t fileCompressed = 0;  // 1 once encoding keys were set
    int32_t statsType = 0;       // ItemStatsType

    float deleteValFloat = F_DELETE_VALUE_FLOAT;
    double deleteValDouble = F_DELETE_VALUE_DOUBLE;
    char deleteValByte = F_DELETE_VALUE_BYTE;
    int32_t deleteValInt = F_DELETE_VALUE_INT;
    uint32_t deleteValUnsignedInt = F_DELETE_VALUE_UNSIGNED_INT;

    int32_t geoInfoType = 0;  // GeoInfoType
    GrdText projection;       // null unless a projection is set
    double longitude = 0.0;
    double latitude = 0.0;
    double orientation = 0.0;

    GrdTimeAxis timeAxis;

    int32_t noOfItems = 0;
    int32_t noOfFileItems = 0;  // item count before a plug-in replaced the list
    std::unique_ptr<GrdItem[]> items;  // items[n - 1] is item n

    std::unique_ptr<GrdCustomBlock> customBlocks;  // in insertion order

    int32_t itemCompressionEnabled = 0;
    GrdArray<int32_t> keyX, keyY, keyZ;  // each may be absent
    int32_t keyLength = 0;

    // Dynamic-data cursor and time bookkeeping of the file layer.
    int32_t nextItem = 0;       // 0-based item under the cursor
    int32_t timeStepsDone = 0;  // time steps written or read so far
    double currentTime = 0.0;   // time of the time step under the cursor
    double largestTime = F_DELETE_VALUE_DOUBLE;  // largest time written; -1e-255: none

    GrdAttachedState legacy;     // legacy translator state (files .dt0-.dt4, .ct0-.ct4)
    GrdAttachedState extension;  // loaded plug-in library and its entry points
    int32_t extReentrant = 0;    // set while the plug-in itself reads the file

    int32_t modifyTimes = 1;

    // Where each item's record lies within a time step (grdItemRecordOffsets),
    // and what it was worked out from. layoutSerial is raised whenever an
    // item's data type or axis is set.
    struct RecordOffsets {
        std::vector<int64_t> at;  // item i's record starts at[i] bytes after the time-step block; at[n]: all
        const GrdItem* items = nullptr;
        int32_t count = -1, fileType = 0, compressed = 0, keyLength = 0;
        uint32_t serial = 0;
    } recordOffsets;
    uint32_t layoutSerial = 0;

    GrdHeader() = default;
    GrdHeader(const GrdHeader&) = delete;
    GrdHeader& operator=(const GrdHeader&) = delete;
    ~GrdHeader();  // releases the extension and legacy states, then the rest
};

namespace grd_detail {

// Product of non-negative factors, saturated at INT64_MAX.
inline int64_t saturatedProduct(int64_t a, int64_t b) noexcept {
    return (b != 0 && a > INT64_MAX / b) ? INT64_MAX : a * b;
}

inline int64_t cappedByKey(const GrdItem* item, bool requireEnabled) noexcept {
    const int64_t full = grdItemFullElements(item);
    const GrdHeader* h = item->owner;
    if (full < 0 || h == nullptr || item->isStatic || !h->fileCompressed) return full;
    if (requireEnabled && !h->itemCompressionEnabled) return full;
    return full < h->keyLength ? full : h->keyLength;
}

}  // namespace grd_detail

inline int64_t grdItemFullElements(const GrdItem* item) noexcept {
    using grd_detail::saturatedProduct;
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
            return (x < 0 || y < 0) ? -1 : saturatedProduct(x, y);
        case F_EQ_AXIS_D3:
        case F_NEQ_AXIS_D3:
        case F_TVAR_AXIS_D3:
        case F_CURVE_LINEAR_AXIS_D3:
            return (x < 0 || y < 0 || z < 0) ? -1 : saturatedProduct(saturatedProduct(x, y), z);
        case F_EQ_AXIS_D4:
            return (x < 0 || y < 0 || z < 0 || t < 0) ? -1
                                                      : saturatedProduct(saturatedProduct(saturatedProduct(x, y), z), t);
        default:
            return -1;
    }
}

inline int64_t grdItemElementCount(const GrdItem* item) noexcept { return grd_detail::cappedByKey(item, true); }
inline int64_t grdItemUsedElementCount(const GrdItem* item) noexcept { return grd_detail::cappedByKey(item, false); }

// A new header with the defaults of a header about to be filled (titles
// empty, default delete values, no items); null when memory fails.
GrdHeader* grdHeaderNew() noexcept;
// Gives the header n fresh items initialised with its float delete value,
// replacing any it had (n >= 0). 2000 when memory fails (items unchanged).
int32_t grdHeaderAllocItems(GrdHeader* header, int32_t n) noexcept;
// Item itemNo (1-based), or null when out of range; no report.
GrdItem* grdHeaderItem(GrdHeader* header, int32_t itemNo) noexcept;

// ---- Argument checks ----------------------------------------------------------------
// Each traces its name on entry and "[%d]" on exit when API tracing is on and
// reports a failure through the dispatcher with the caller's module and line.

int32_t grdCheckHeader(HeaderHandle header, const char* module, int32_t line);
int32_t grdCheckFile(FileHandle file, const char* module, int32_t line);
// Header, then file, then that the file was created with or read into this
// header (1000 for a file of another header; a file of no header passes).
int32_t grdCheckHeaderFile(HeaderHandle header, FileHandle file, const char* module, int32_t line);
// Makes file the header's own: later checks refuse it with any other header.
void grdBindFile(const GrdHeader* header, FileHandle file) noexcept;
// 1000 for a null header (the number is not looked at), 2007 outside 1..n.
int32_t grdCheckHeaderItemNo(HeaderHandle header, int32_t itemNo, const char* module, int32_t line);
int32_t grdCheckItem(ItemHandle item, const char* module, int32_t line);
// A static item ("vector").
int32_t grdCheckVector(ItemHandle vector, const char* module, int32_t line);
int32_t grdCheckVectorFile(ItemHandle vector, FileHandle file, const char* module, int32_t line);
int32_t grdCheckCustomBlock(CustomBlockHandle block, const char* module, int32_t line);
// Zeroed allocation of bytes into *out: 0, or 2000 with *out null. Traced on
// entry under the name grdCheckTypeSize, on exit "%p [%d]".
int32_t grdCheckAllocZeroed(void** out, size_t bytes, const char* module, int32_t line);

// ---- Tracing of exported calls ---------------------------------------------------------

// Brackets one exported call with its enter and exit lines when API tracing
// is on. The exit line "[%d]" is printed on destruction with the status
// handed to done().
class GrdApiTrace {
public:
    template <class... Args>
    explicit GrdApiTrace(const char* format, Args... args) noexcept : on_(tova::traceApiOn()) {
        if (on_) DebugEnter(format, args...);
    }
    ~GrdApiTrace() {
        if (on_) DebugExit("[%d]", status_);
    }
    GrdApiTrace(const GrdApiTrace&) = delete;
    GrdApiTrace& operator=(const GrdApiTrace&) = delete;

    int32_t done(int32_t status) noexcept {
        status_ = status;
        return status;
    }
    bool on() const noexcept { return on_; }
    // A line between the enter and exit lines.
    template <class... Args>
    void print(const char* format, Args... args) const noexcept {
        if (on_) DebugPrint(format, args...);
    }

private:
    bool on_;
    int32_t status_ = 0;
};

// A traced getter of one value of a handle that check accepts (check is one
// of the argument checks above); the fallback when it refuses the handle.
template <class T, class H, class Check, class Fn>
T grdTracedGet(const char* name, H handle, Check check, const char* module, int32_t line, T fallback, Fn fn) {
    GrdApiTrace trace(name);
    if (trace.done(check(handle, module, line)) != F_NO_ERROR) return fallback;
    return fn(handle);
}

// A traced operation on a handle that check accepts; fn returns a status.
// The enter line is format with args.
template <class H, class Check, class Fn, class... Args>
int32_t grdTracedDo(H handle, Check check, const char* module, int32_t line, Fn fn, const char* format,
                    Args... args) {
    GrdApiTrace trace(format, args...);
    const int32_t status = check(handle, module, line);
    return trace.done(status != F_NO_ERROR ? status : fn(handle));
}

// A text safe to hand to "%s".
inline const char* grdTraceText(const char* text) noexcept { return text ? text : "(null)"; }
