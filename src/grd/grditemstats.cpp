// Gridded data-file layer, module grditemstats: running statistics of the
// items, updated with every time step written. Every item keeps its global
// extremes and count of delete values; with statistics type 2 or 3 every
// used element also keeps extremes, sums for mean and variance and the
// lag-one sums of its autocorrelation (a delete value breaks the chain).
// The update is on the write path: it switches on the data type once per
// call, and the global-only pass is a plain extremes scan.
#include <algorithm>
#include <cmath>
#include <limits>
#include <type_traits>

#include "common/capi.h"
#include "grd/grddynamic.h"
#include "grd/grdextremes.h"
#include "grd/grdio.h"

namespace {

constexpr const char* kModule = kModGrdItemStats;

// The global pass of one data type.
template <class T>
GrdExtremes scanGlobal(const T* p, int64_t n, T del, bool hasDelete) {
    // A scalar or short item (written once per call) skips the vector set-up.
    if (n < 8) return grdScanExtremesScalar(p, n, del, hasDelete);
    if constexpr (std::is_same_v<T, float> || std::is_same_v<T, double>) {
        return grdScanExtremes(p, n, del);
    } else {
        return grdScanExtremesScalar(p, n, del, hasDelete);
    }
}

// Merges a pass's extremes into the item's: a stored extreme that is still the
// double delete value (none yet) is replaced, otherwise the wider one is kept.
void mergeGlobal(GrdItem* item, const GrdExtremes& e, double del) {
    item->globalDeletes += static_cast<double>(e.deletes);
    if (e.values == 0) return;
    if (item->globalMax == del || item->globalMax <= e.max) item->globalMax = e.max;
    if (item->globalMin == del || item->globalMin >= e.min) item->globalMin = e.min;
}

// Per-element statistics of the first n elements, together with the global
// extremes. A delete value counts and breaks the element's lag-one chain.
template <class T>
GrdExtremes updateElements(const T* p, int64_t n, T delT, bool hasDelete, GrdElementStats* stats, double del) {
    GrdExtremes e{std::numeric_limits<double>::infinity(), -std::numeric_limits<double>::infinity(), 0, 0};
    for (int64_t i = 0; i < n; ++i) {
        GrdElementStats& s = stats[i];
        const T v = p[i];
        if (hasDelete && v == delT) {
            ++e.deletes;
            s.deletes += 1.0;
            s.previous = del;
            continue;
        }
        const double x = static_cast<double>(v);
        if (s.max == del || s.max <= x) s.max = x;
        if (s.min == del || s.min >= x) s.min = x;
        s.sum += x;
        s.sumSquares += x * x;
        s.values += 1.0;
        if (s.previous != del) {
            s.lagSum += s.previous * x;
            s.pairs += 1.0;
        }
        s.previous = x;
        e.min = x < e.min ? x : e.min;
        e.max = x > e.max ? x : e.max;
    }
    e.values = n - e.deletes;
    return e;
}

// One update over the n values of type T; stats is null for global
// statistics only, else holds the records of the first nStats elements.
// A pass begun beside the write (float and double only) stands in for the
// global scan.
template <class T>
void updateTyped(GrdItem* item, const void* data, int64_t n, T delT, bool hasDelete, GrdElementStats* stats,
                 int64_t nStats, double del, GrdExtremesBeside* started = nullptr) {
    const T* p = static_cast<const T*>(data);
    if (started != nullptr && stats == nullptr) return mergeGlobal(item, started->result(), del);
    const int64_t withRecords = stats == nullptr ? 0 : std::clamp<int64_t>(nStats, 0, n);
    if (withRecords > 0) mergeGlobal(item, updateElements(p, withRecords, delT, hasDelete, stats, del), del);
    // Elements beyond the records (never the case for a consistent header)
    // still count for the global statistics.
    if (withRecords < n) mergeGlobal(item, scanGlobal(p + withRecords, n - withRecords, delT, hasDelete), del);
}

// Whether the header's statistics type keeps per-element records.
bool perElement(const GrdHeader* h) {
    return h->statsType == F_ITEM_STATS_ELEMENT || h->statsType == F_ITEM_STATS_ELEMENT_ALT;
}

// A count kept as a double, as an integer (a damaged file may hold anything).
int32_t countOf(double count) {
    const double v = count + 0.1;
    if (!(v >= 0.0)) return 0;
    return v >= 2147483647.0 ? std::numeric_limits<int32_t>::max() : static_cast<int32_t>(v);
}

// The update with the item's n used elements, switched once on the data type.
void update(const GrdHeader* h, GrdItem* item, const void* values, int64_t n, GrdExtremesBeside* started) {
    // An item whose records were not made (memory) keeps global statistics.
    GrdElementStats* stats = perElement(h) ? item->elemStats.get() : nullptr;
    const int64_t nStats = stats != nullptr ? item->elemStatsCount : 0;
    const double del = h->deleteValDouble;
    switch (item->dataType) {
        case RCF_FLOAT: updateTyped<float>(item, values, n, h->deleteValFloat, true, stats, nStats, del, started); break;
        case RCF_DOUBLE: updateTyped<double>(item, values, n, del, true, stats, nStats, del, started); break;
        // A byte is taken as a signed 8-bit value, like its delete value.
        case RCF_BYTE:
            updateTyped<int8_t>(item, values, n, static_cast<int8_t>(h->deleteValByte), true, stats, nStats, del);
            break;
        case RCF_INT4: updateTyped<int32_t>(item, values, n, h->deleteValInt, true, stats, nStats, del); break;
        case RCF_UINT4:
            updateTyped<uint32_t>(item, values, n, h->deleteValUnsignedInt, true, stats, nStats, del);
            break;
        // The 16-bit types have no delete value: every value counts.
        case RCF_INT2: updateTyped<int16_t>(item, values, n, 0, false, stats, nStats, del); break;
        case RCF_UINT2: updateTyped<uint16_t>(item, values, n, 0, false, stats, nStats, del); break;
        default: break;
    }
}

// The checks of the update, with its trace lines: 2010 for an unknown
// statistics type.
int32_t checkUpdate(GrdHeader* header, int32_t itemNo, const GrdApiTrace& trace) {
    int32_t status = grdCheckHeaderItemNo(header, itemNo, kModule, __LINE__);
    if (status != F_NO_ERROR) return status;
    if (grdItemUsedElementCount(&header->items[itemNo - 1]) <= 0) {
        trace.print("F_NO_ERROR = OK");
    } else if (!perElement(header) && header->statsType != F_ITEM_STATS_GLOBAL) {
        // An unknown statistics type keeps the global extremes only.
        trace.print("F_ERR_DATA");
        status = grdReportError(header, nullptr, 0, F_ERR_VALUE, kModule, __LINE__);
    }
    return status;
}

}  // namespace

void grdStartGlobalStatistics(const GrdHeader* header, const GrdItem* item, const void* values, int64_t n,
                              std::optional<GrdExtremesBeside>& pass) {
    if (header == nullptr || item == nullptr || values == nullptr || n <= 0) return;
    if (header->statsType != F_ITEM_STATS_GLOBAL) return;
    // The pass itself decides whether the helper takes it.
    if (item->dataType == RCF_FLOAT) pass.emplace(static_cast<const float*>(values), n, header->deleteValFloat);
    if (item->dataType == RCF_DOUBLE) pass.emplace(static_cast<const double*>(values), n, header->deleteValDouble);
}

int32_t grdCalcStatistics(GrdHeader* header, int32_t itemNo, const void* values, GrdExtremesBeside* started) {
    GrdApiTrace trace("grdCalcStatistics %d", itemNo);
    const int32_t status = checkUpdate(header, itemNo, trace);
    if (status != F_NO_ERROR && status != F_ERR_VALUE) return trace.done(status);
    GrdItem* item = &header->items[itemNo - 1];
    const int64_t n = grdItemUsedElementCount(item);
    if (n > 0 && values != nullptr) update(header, item, values, n, started);
    return trace.done(status);
}

extern "C" {

int32_t TOVA_CALL grdGetItemStats(HeaderHandle header, int32_t itemNo, int32_t element, double* minimum,
                                  double* maximum, double* mean, double* stdDev, double* autoCorrelation,
                                  int32_t* values, int32_t* deletes, int32_t* pairs) {
    GrdApiTrace trace("grdGetItemStats");
    return trace.done(tova::guarded([&]() -> int32_t {
        const int32_t status = grdCheckHeaderItemNo(header, itemNo, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (header->statsType == F_ITEM_STATS_GLOBAL)
            return grdReportError(header, nullptr, 0, F_ERR_ARGUMENT, kModule, __LINE__);
        if (header->statsType != F_ITEM_STATS_ELEMENT && header->statsType != F_ITEM_STATS_ELEMENT_ALT)
            return grdReportError(header, nullptr, 0, F_ERR_VALUE, kModule, __LINE__);
        const GrdItem* item = &header->items[itemNo - 1];
        const int64_t used = grdItemUsedElementCount(item);
        if (element < 0 || element >= used || element >= item->elemStatsCount || !item->elemStats)
            return grdReportError(header, nullptr, 0, F_ERR_ELEMENT, kModule, __LINE__);

        const GrdElementStats& s = item->elemStats[element];
        const double D = header->deleteValDouble;
        const double n = s.values;
        const double m = n > 0 ? s.sum / n : D;
        double variance = D;
        if (n > 1) {
            variance = s.sumSquares / (n - 1) - m * m * n / (n - 1);
            if (variance < 0) variance = 0;
        }
        const double covariance = s.pairs > 0 ? s.lagSum / s.pairs - m * m : D;
        if (minimum) *minimum = grdConvertItemValue(header, item, s.min);
        if (maximum) *maximum = grdConvertItemValue(header, item, s.max);
        if (mean) *mean = grdConvertItemValue(header, item, m);
        if (stdDev) *stdDev = variance == D ? D : std::sqrt(variance);
        if (autoCorrelation)
            *autoCorrelation = (covariance == D || variance == D || variance == 0) ? D : covariance / variance;
        if (values) *values = countOf(s.values);
        if (deletes) *deletes = countOf(s.deletes);
        if (pairs) *pairs = countOf(s.pairs);
        return F_NO_ERROR;
    }));
}

int32_t TOVA_CALL grdGetItemStatsGlobal(ItemHandle item, double* minimum, double* maximum, int32_t* deletes) {
    GrdApiTrace trace("grdGetItemStatsGlobal");
    return trace.done(tova::guarded([&]() -> int32_t {
        const int32_t status = grdCheckItem(item, kModule, __LINE__);
        if (status != F_NO_ERROR) return status;
        if (minimum) *minimum = grdConvertItemValue(item->owner, item, item->globalMin);
        if (maximum) *maximum = grdConvertItemValue(item->owner, item, item->globalMax);
        if (deletes) *deletes = countOf(item->globalDeletes);
        return F_NO_ERROR;
    }));
}

}  // extern "C"

