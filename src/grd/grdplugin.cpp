// Gridded data-file layer, module grdopen (plug-in half): extension plug-ins.
// grdEnablePlugin loads the library that a file's data type selects, looks up
// its entry points and replaces the header's items by the items the plug-in
// offers; grdUnloadPlugin (and the header's destruction) terminates and
// unloads it. The dynamic-data path hands reads and skips to
// grdPluginDeliver while a plug-in is loaded.
//
// The plug-in state lives in header->extension. The file's own item list is
// kept there too: whenever the library calls into the plug-in, the header
// shows the file as it is (its items and item count) and the re-entrancy flag
// is set, so that the plug-in's own reads go to the file with the file's
// item records, whatever the plug-in made of its copies.
#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <limits>
#include <memory>
#include <type_traits>
#include <utility>

#include "common/capi.h"
#include "grd/grdio.h"
#include "grd/grdplugin.h"
#include "platform/platform.h"
#include "rcf/rcf_internal.h"
#include "tova/grdext.h"

namespace {

constexpr const char* kModule = "..\\grd\\grdopen";

// Results of grdEnablePlugin, returned without a report.
constexpr int32_t kRefused = -1;
constexpr int32_t kNoDataType = -2;
constexpr int32_t kNoLibrary = -3;

// ---- The library ---------------------------------------------------------------

// A loaded plug-in library, unloaded on destruction.
class PluginLibrary {
public:
    PluginLibrary() = default;
    ~PluginLibrary() { close(); }
    PluginLibrary(const PluginLibrary&) = delete;
    PluginLibrary& operator=(const PluginLibrary&) = delete;

    // Loads "grdExt_<number>" by the platform loader's standard search: a
    // bare file name, so the search never looks in the data file's folder.
    bool open(int64_t number) {
        char name[64];
        std::snprintf(name, sizeof name, "grdExt_%" PRId64 "%s", number, platform::kSharedLibrarySuffix);
        handle_ = platform::libraryLoad(name);
        return handle_ != nullptr;
    }

    // The entry point name as Fn, or null.
    template <class Fn>
    Fn symbol(const char* name) const {
        return reinterpret_cast<Fn>(platform::librarySymbol(handle_, name));
    }

    void close() {
        if (handle_ == nullptr) return;
        platform::libraryFree(handle_);
        handle_ = nullptr;
    }

private:
    void* handle_ = nullptr;
};

struct EntryPoints {
    grdExtInitializeFn initialize = nullptr;
    grdExtTerminateFn terminate = nullptr;
    grdExtGetNoOfItemsFn getNoOfItems = nullptr;
    grdExtGetItemInfoFn getItemInfo = nullptr;
    grdExtGetItemAxisTypeFn getItemAxisType = nullptr;
    grdExtGetItemAxisEqFn getItemAxisEq = nullptr;
    grdExtIsItemDerivedFn isItemDerived = nullptr;
    grdExtGetItemStatsGlobalFn getItemStatsGlobal = nullptr;
    grdExtGetItemValueTypeFn getItemValueType = nullptr;
    grdExtNewTimeStepFn newTimeStep = nullptr;
    grdExtReadItemTimeStepFn readItemTimeStep = nullptr;

    // Looks up all eleven; false when a required one is missing.
    bool lookUp(const PluginLibrary& lib) {
        initialize = lib.symbol<grdExtInitializeFn>(GRD_EXT_INITIALIZE);
        terminate = lib.symbol<grdExtTerminateFn>(GRD_EXT_TERMINATE);
        getNoOfItems = lib.symbol<grdExtGetNoOfItemsFn>(GRD_EXT_GET_NO_OF_ITEMS);
        getItemInfo = lib.symbol<grdExtGetItemInfoFn>(GRD_EXT_GET_ITEM_INFO);
        getItemAxisType = lib.symbol<grdExtGetItemAxisTypeFn>(GRD_EXT_GET_ITEM_AXIS_TYPE);
        getItemAxisEq = lib.symbol<grdExtGetItemAxisEqFn>(GRD_EXT_GET_ITEM_AXIS_EQ);
        isItemDerived = lib.symbol<grdExtIsItemDerivedFn>(GRD_EXT_IS_ITEM_DERIVED);
        getItemStatsGlobal = lib.symbol<grdExtGetItemStatsGlobalFn>(GRD_EXT_GET_ITEM_STATS_GLOBAL);
        getItemValueType = lib.symbol<grdExtGetItemValueTypeFn>(GRD_EXT_GET_ITEM_VALUE_TYPE);
        newTimeStep = lib.symbol<grdExtNewTimeStepFn>(GRD_EXT_NEW_TIME_STEP);
        readItemTimeStep = lib.symbol<grdExtReadItemTimeStepFn>(GRD_EXT_READ_ITEM_TIME_STEP);
        return getNoOfItems && getItemInfo && isItemDerived && newTimeStep && readItemTimeStep;
    }
};

// ---- The state kept in the header --------------------------------------------------

struct PluginState {
    PluginLibrary library;
    EntryPoints entry;
    bool initialized = false;  // grdExtInitialize succeeded (or there is none): terminate once
    // The file's own items while the header holds the plug-in's (swapped in
    // for the duration of every call into the plug-in).
    bool holdsFileItems = false;
    std::unique_ptr<GrdItem[]> items;
    int32_t noOfItems = 0;
};

PluginState* stateOf(const GrdHeader* header) { return static_cast<PluginState*>(header->extension.data); }

// Brackets every call into the plug-in: the re-entrancy flag is set, so that
// the plug-in's reads and skips go to the file, and the header shows the
// file's own items.
class PluginCall {
public:
    PluginCall(GrdHeader* header, PluginState* state) : header_(header), state_(state) {
        header_->extReentrant = 1;
        swapItems();
    }
    ~PluginCall() {
        swapItems();
        header_->extReentrant = 0;
    }
    PluginCall(const PluginCall&) = delete;
    PluginCall& operator=(const PluginCall&) = delete;

private:
    void swapItems() {
        if (!state_->holdsFileItems) return;
        std::swap(header_->items, state_->items);
        std::swap(header_->noOfItems, state_->noOfItems);
    }
    GrdHeader* header_;
    PluginState* state_;
};

// Terminates the plug-in (once, if it was initialised) and returns the status
// of grdExtTerminate (0 without one).
int32_t terminate(GrdHeader* header, PluginState* state) {
    if (!state->initialized) return F_NO_ERROR;
    state->initialized = false;
    if (state->entry.terminate == nullptr) return F_NO_ERROR;
    PluginCall call(header, state);
    return state->entry.terminate(header);
}

// Terminates, unloads and frees the plug-in of header; the plug-in's items
// stay. Returns the status of grdExtTerminate.
int32_t unload(GrdHeader* header) {
    PluginState* state = stateOf(header);
    if (state == nullptr) return F_NO_ERROR;
    const std::unique_ptr<PluginState> owned(state);  // on return: closes the library, frees the file's items
    const int32_t status = terminate(header, state);  // still the header's plug-in meanwhile
    header->extension = GrdAttachedState{};
    header->extReentrant = 0;
    return status;
}

// The header's release hook.
void release(GrdHeader* header) { unload(header); }

// ---- The plug-in's items -----------------------------------------------------------

// Axis kinds of the equidistant axes of 0 to 3 dimensions.
constexpr int32_t kEqAxisOfDim[4] = {F_EQ_AXIS_D0, F_EQ_AXIS_D1, F_EQ_AXIS_D2, F_EQ_AXIS_D3};

// Gives item the equidistant axis of dims dimensions (what grdExtGetItemAxisType
// chose). The copied axis keeps its values in the directions that remain;
// coordinate arrays go.
void setEqAxisKind(GrdItem& item, int32_t dims) {
    const int32_t kind = kEqAxisOfDim[dims];
    if (item.axisType == kind) return;
    item.axisType = kind;
    for (int32_t d = dims; d < 4; ++d) {
        item.size[d] = 0;
        item.origin[d] = 0.0f;
        item.step[d] = 0.0f;
    }
    for (GrdArray<double>& c : item.coords) c.reset();
    item.diskPoints.reset();
    item.diskPointCount = 0;
}

// A count kept as a double, as an out argument can hold it.
int32_t countOf(double value) {
    return value >= 0.0 && value <= std::numeric_limits<int32_t>::max() ? static_cast<int32_t>(value) : 0;
}

// Builds the plug-in's item k from its copy. *last receives the status of
// every description call made. Returns 0, kRefused, or a failure status
// (reported).
int32_t describeItem(GrdHeader* header, const EntryPoints& e, int32_t k, GrdItem& item, int32_t* last) {
    // A derived item, or one beyond the file's items, keeps nothing of the
    // item it was copied from but its axis and settings: no texts, links or
    // statistics.
    const bool fresh = e.isItemDerived(header, k) != 0 || k > header->noOfItems;
    if (fresh) {
        item.name.reset();
        item.unitText.reset();
        item.assocStatic.clear();
    }

    int32_t itemType = item.itemType, unit = item.unit, dataType = item.dataType;
    const char* name = nullptr;
    const char* unitName = nullptr;
    const char* otherName = nullptr;
    *last = e.getItemInfo(header, k, &itemType, &name, &unit, &unitName, &dataType, &otherName);
    if (*last == 0) {
        item.itemType = itemType;
        item.unit = unit;
        item.dataType = dataType;
        if ((name != nullptr && !item.name.assign(name)) || (unitName != nullptr && !item.unitText.assign(unitName)))
            return grdReportError(header, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__);
    }

    if (e.getItemValueType != nullptr) {
        const int32_t valueType = e.getItemValueType(header, k);
        if (valueType >= 0 && valueType <= 3) item.valueType = valueType;
    }

    // Preset statistics are applied after the axis, whose element count may
    // start the statistics afresh.
    double minimum = item.globalMin, maximum = item.globalMax;
    int32_t deletes = countOf(item.globalDeletes);
    bool presetStats = false;
    if (e.getItemStatsGlobal != nullptr) {
        *last = e.getItemStatsGlobal(header, k, &minimum, &maximum, &deletes);
        presetStats = *last == 0;
    }

    const int64_t before = grdItemElementCount(&item);
    if (e.getItemAxisType != nullptr) {
        const int32_t dims = e.getItemAxisType(header, k);
        if (dims > 3) return kRefused;
        if (dims >= 0) {
            setEqAxisKind(item, dims);
            if (e.getItemAxisEq != nullptr) {
                int32_t axisUnit = item.axisUnit;
                int32_t sizes[3] = {item.size[0], item.size[1], item.size[2]};
                float starts[3] = {item.origin[0], item.origin[1], item.origin[2]};
                float steps[3] = {item.step[0], item.step[1], item.step[2]};
                *last = e.getItemAxisEq(header, k, &axisUnit, sizes, starts, steps);
                if (*last == 0) {
                    for (int32_t d = 0; d < dims; ++d) {
                        if (sizes[d] < 1) return kRefused;
                        item.size[d] = sizes[d];
                        item.origin[d] = starts[d];
                        item.step[d] = steps[d];
                    }
                    item.axisUnit = axisUnit;
                }
            }
            if (grdItemElementCount(&item) < 1) return kRefused;
        }
    }
    // Per-element statistics follow the element count.
    const int64_t after = grdItemElementCount(&item);
    const bool statsFit = header->statsType == F_ITEM_STATS_GLOBAL || item.elemStatsCount == after;
    if (fresh || after != before || !statsFit) {
        const int32_t status = grdItemInitStatistics(header, &item, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
    }
    if (presetStats) {
        item.globalMin = minimum;
        item.globalMax = maximum;
        item.globalDeletes = deletes;
    }
    return F_NO_ERROR;
}

// The plug-in's item list: M items built from copies of the file's. *last
// receives the status of the last description call.
int32_t buildItems(GrdHeader* header, const EntryPoints& e, int32_t m, std::unique_ptr<GrdItem[]>& out,
                   int32_t* last) {
    std::unique_ptr<GrdItem[]> items = grdNewArray<GrdItem>(m);
    if (!items) return grdReportError(header, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__);
    const int32_t n = header->noOfItems;
    for (int32_t k = 1; k <= m; ++k) {
        GrdItem& item = items[k - 1];
        // Item k of the file, or beyond its items item 1 (describeItem drops
        // its texts).
        if (n < 1) {
            grdItemInit(&item, header->deleteValFloat);
        } else if (!grdItemCopy(&item, &header->items[k <= n ? k - 1 : 0])) {
            return grdReportError(header, nullptr, 0, F_ERR_MEMORY, kModule, __LINE__);
        }
        item.owner = header;
        const int32_t status = describeItem(header, e, k, item, last);
        if (status != F_NO_ERROR) return status;
    }
    out = std::move(items);
    return F_NO_ERROR;
}

int32_t enablePlugin(GrdHeader* header, FileHandle file) {
    // (A file of the legacy translator would ask it whether a plug-in is
    // allowed; tova has no legacy translator.)
    if (file == nullptr || file->readOnly == 0) return kRefused;
    if (header->extension.data != nullptr || header->extReentrant != 0) return kRefused;  // one at a time
    // The plug-in takes over from the first item of a time step on.
    if (header->nextItem != 0) return kRefused;
    if (header->dataType == 0) return kNoDataType;

    std::unique_ptr<PluginState> state(grdNew<PluginState>());
    if (!state) return grdReportError(header, file, 0, F_ERR_MEMORY, kModule, __LINE__);
    const int64_t dataType = header->dataType;
    if (!state->library.open(dataType < 0 ? -dataType : dataType)) return kNoLibrary;
    if (!state->entry.lookUp(state->library)) return kRefused;
    const EntryPoints& e = state->entry;

    // From here on the header holds the state, so that the plug-in finds
    // itself loaded while it is called; a refusal takes it out again.
    header->extension = GrdAttachedState{state.get(), release};
    struct Detach {
        GrdHeader* header;
        PluginState* state;
        bool keep = false;
        ~Detach() {
            if (keep) return;
            terminate(header, state);
            header->extension = GrdAttachedState{};
            header->extReentrant = 0;
        }
    } detach{header, state.get()};

    int32_t m = 0;
    int32_t last = F_NO_ERROR;
    std::unique_ptr<GrdItem[]> items;
    {
        PluginCall call(header, state.get());
        if (e.initialize != nullptr && e.initialize(header, file) != 0) return kRefused;
        state->initialized = true;
        m = e.getNoOfItems(header);
        if (m < 1) return kRefused;
        const int32_t status = buildItems(header, e, m, items, &last);
        if (status != F_NO_ERROR) return status;
    }

    // Replace the item list; the file's own stays with the plug-in state.
    // Their data are handed to the plug-in as stored: the caller's unit
    // conversions apply to what the plug-in delivers.
    for (int32_t i = 0; i < header->noOfItems; ++i) {
        header->items[i].itemConvMode = 0;
        header->items[i].itemConvUnit = 0;
    }
    state->items = std::move(header->items);
    state->noOfItems = header->noOfItems;
    state->holdsFileItems = true;
    header->noOfFileItems = header->noOfItems;
    header->items = std::move(items);
    header->noOfItems = m;
    detach.keep = true;
    state.release();  // owned by the header now
    return last;
}

}  // namespace

// ---- Shared with the dynamic-data path ------------------------------------------------

int32_t grdPluginDeliver(GrdHeader* header, FileHandle file, void* data, bool read) {
    PluginState* state = stateOf(header);
    const int32_t next = header->nextItem;
    const int32_t done = header->timeStepsDone;
    int32_t status = F_NO_ERROR;
    {
        PluginCall call(header, state);
        if (next == 0) {
            status = state->entry.newTimeStep(header, file);
            // The plug-in's reads moved the cursor through the file's items.
            header->nextItem = 0;
            header->timeStepsDone = done;
        }
        if (status == F_NO_ERROR && read) status = state->entry.readItemTimeStep(header, file, data);
        header->nextItem = next;
        header->timeStepsDone = done;
    }
    return status;
}

bool grdItemCopy(GrdItem* to, const GrdItem* from) noexcept {
    bool ok = to->name.assign(from->name.get());
    ok = to->unitText.assign(from->unitText.get()) && ok;
    to->itemType = from->itemType;
    to->unit = from->unit;
    to->dataType = from->dataType;
    to->globalMax = from->globalMax;
    to->globalMin = from->globalMin;
    to->globalDeletes = from->globalDeletes;
    to->axisType = from->axisType;
    to->axisUnit = from->axisUnit;
    for (int32_t d = 0; d < 4; ++d) {
        to->size[d] = from->size[d];
        to->origin[d] = from->origin[d];
        to->step[d] = from->step[d];
    }
    const auto copyArray = [&ok](auto& dst, const auto& src, int64_t count) {
        dst.reset();
        if (!src || count <= 0) return;
        using T = std::remove_reference_t<decltype(src[0])>;
        dst = grdAllocArray<std::remove_const_t<T>>(count);
        if (dst) std::memcpy(dst.get(), src.get(), static_cast<size_t>(count) * sizeof(T));
        ok = ok && dst;
    };
    for (int32_t d = 0; d < 3; ++d) copyArray(to->coords[d], from->coords[d], grdItemCoordinateCount(from, d));
    copyArray(to->diskPoints, from->diskPoints, int64_t{from->diskPointCount} * 3);
    to->diskPointCount = to->diskPoints ? from->diskPointCount : 0;
    to->axisConvMode = from->axisConvMode;
    to->axisConvUnit = from->axisConvUnit;
    to->valueType = from->valueType;
    to->owner = from->owner;
    to->isStatic = from->isStatic;
    to->itemConvMode = from->itemConvMode;
    to->itemConvUnit = from->itemConvUnit;
    to->refX = from->refX;
    to->refY = from->refY;
    to->refZ = from->refZ;
    to->alpha = from->alpha;
    to->phi = from->phi;
    to->theta = from->theta;
    copyArray(to->elemStats, from->elemStats, from->elemStatsCount);
    to->elemStatsCount = to->elemStats ? from->elemStatsCount : 0;
    try {
        to->assocStatic = from->assocStatic;
    } catch (...) {
        ok = false;
    }
    return ok;
}

// ---- Exported interface --------------------------------------------------------------------

extern "C" {

int32_t TOVA_CALL grdEnablePlugin(HeaderHandle header, FileHandle file) {
    GrdApiTrace trace("grdEnablePlugin");
    return trace.done(tova::guarded([&]() -> int32_t {
        // Without a file nothing is loaded (refused below); a file of another
        // header is a wrong argument.
        const int32_t status = file != nullptr ? grdCheckHeaderFile(header, file, kModule, __LINE__)
                                               : grdCheckHeader(header, kModule, __LINE__);
        return status != F_NO_ERROR ? status : enablePlugin(header, file);
    }));
}

int32_t TOVA_CALL grdUnloadPlugin(HeaderHandle header) {
    GrdApiTrace trace("grdUnloadPlugin");
    return trace.done(tova::guarded([&]() -> int32_t {
        const int32_t status = grdCheckHeader(header, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (header->extReentrant != 0) return kRefused;  // not from within the plug-in
        return unload(header);
    }));
}

int32_t TOVA_CALL grdGetItemCursor(HeaderHandle header, int32_t* nextItemNo, int32_t* timeStepsDone) {
    GrdApiTrace trace("grdGetItemCursor");
    const int32_t status = grdCheckHeader(header, kModule, __LINE__);
    if (status == F_NO_ERROR) {
        if (nextItemNo != nullptr) *nextItemNo = header->nextItem + 1;
        if (timeStepsDone != nullptr) *timeStepsDone = header->timeStepsDone;
    }
    return trace.done(status);
}

}  // extern "C"
