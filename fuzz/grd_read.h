// Reading a gridded data file the way the fuzz targets of the gridded files
// do (fuzz_grd directly, fuzz_plugin through the example plug-in): the header
// queried through every getter (items, axes, units, time axis, custom
// blocks, encoding keys), every static item read with its values, every time
// step of every item read (in turn with each unit conversion mode, sometimes
// skipped), the statistics asked for and a few searches around the dynamic
// data. Buffers are exactly as large as the API promises to fill, so ASan
// sees any write past what an item's counts say.
#pragma once

#include <algorithm>
#include <cstring>
#include <vector>

#include "fuzz_common.h"
#include "grd/grdheader.h"
#include "grd/grdstatic.h"
#include "tova/grd.h"
#include "tova/rcf.h"

namespace grdread {

// Largest array handed to a read, in bytes. An uncompressed item's values
// must be in the file; a compressed item is spread over its full grid, which
// the file does not bound, so larger grids are read without a buffer.
constexpr int64_t kMaxBuffer = 4 << 20;
// Upper bound of reads, skips and searches of the dynamic data per input.
constexpr int32_t kMaxDynamicCalls = 4096;

inline void keepText(const char* text) {
    if (text != nullptr) fuzz::keep(fuzz::touch(text, std::strlen(text) + 1));
}

template <class... T>
inline void keepValues(const T&... values) {
    (fuzz::keep(fuzz::touch(&values, sizeof values)), ...);
}

inline void keepArray(const double* values, int64_t count) {
    if (values != nullptr && count > 0) fuzz::keep(fuzz::touch(values, static_cast<size_t>(count) * sizeof(double)));
}

// Every axis getter of the item's axis kind, with the coordinate arrays read
// to the length the item's sizes promise.
inline void queryAxis(ItemHandle item) {
    int32_t unit = 0, nx = 0, ny = 0, nz = 0, nt = 0;
    const char* unitText = nullptr;
    float x0 = 0, y0 = 0, z0 = 0, t0 = 0, dx = 0, dy = 0, dz = 0, dt = 0;
    const double *xs = nullptr, *ys = nullptr, *zs = nullptr;
    const int32_t type = grdGetItemAxisType(item);
    switch (type) {
        case F_EQ_AXIS_D0: grdGetItemAxisEqD0(item, &unit, &unitText); break;
        case F_EQ_AXIS_D1: grdGetItemAxisEqD1(item, &unit, &unitText, &nx, &x0, &dx); break;
        case F_EQ_AXIS_D2: grdGetItemAxisEqD2(item, &unit, &unitText, &nx, &ny, &x0, &y0, &dx, &dy); break;
        case F_EQ_AXIS_D3:
            grdGetItemAxisEqD3(item, &unit, &unitText, &nx, &ny, &nz, &x0, &y0, &z0, &dx, &dy, &dz);
            break;
        case F_EQ_AXIS_D4:
            grdGetItemAxisEqD4(item, &unit, &unitText, &nx, &ny, &nz, &nt, &x0, &y0, &z0, &t0, &dx, &dy, &dz, &dt);
            break;
        case F_NEQ_AXIS_D1:
            if (grdGetItemAxisNeqD1(item, &unit, &unitText, &nx, &xs) == 0) keepArray(xs, int64_t{nx} + 1);
            break;
        case F_NEQ_AXIS_D2:
            if (grdGetItemAxisNeqD2(item, &unit, &unitText, &nx, &ny, &xs, &ys) == 0) {
                keepArray(xs, int64_t{nx} + 1);
                keepArray(ys, int64_t{ny} + 1);
            }
            break;
        case F_NEQ_AXIS_D3:
            if (grdGetItemAxisNeqD3(item, &unit, &unitText, &nx, &ny, &nz, &xs, &ys, &zs) == 0) {
                keepArray(xs, int64_t{nx} + 1);
                keepArray(ys, int64_t{ny} + 1);
                keepArray(zs, int64_t{nz} + 1);
            }
            break;
        case F_CURVE_LINEAR_AXIS_D2:
            if (grdGetItemAxisCurveLinearD2(item, &unit, &unitText, &nx, &ny, &xs, &ys) == 0) {
                const int64_t nodes = (int64_t{nx} + 1) * (int64_t{ny} + 1);
                keepArray(xs, nodes);
                keepArray(ys, nodes);
            }
            break;
        case F_CURVE_LINEAR_AXIS_D3:
            if (grdGetItemAxisCurveLinearD3(item, &unit, &unitText, &nx, &ny, &nz, &xs, &ys, &zs) == 0) {
                const int64_t nodes = (int64_t{nx} + 1) * (int64_t{ny} + 1) * (int64_t{nz} + 1);
                keepArray(xs, nodes);
                keepArray(ys, nodes);
                keepArray(zs, nodes);
            }
            break;
        case F_TVAR_AXIS_D1: grdGetItemAxisTvarD1(item, &unit, &unitText, &nx); break;
        case F_TVAR_AXIS_D2: grdGetItemAxisTvarD2(item, &unit, &unitText, &nx, &ny); break;
        case F_TVAR_AXIS_D3: grdGetItemAxisTvarD3(item, &unit, &unitText, &nx, &ny, &nz); break;
        default: break;
    }
    keepText(unitText);
    keepValues(unit, nx, ny, nz, nt, x0, y0, z0, t0, dx, dy, dz, dt);
}

// The item getters shared by the items of the header and static items.
inline void queryItem(ItemHandle item) {
    int32_t itemType = 0, unit = 0, dataType = 0, mode = 0, convUnit = 0, valueType = 0;
    const char *typeText = nullptr, *name = nullptr, *unitText = nullptr;
    grdGetItemInfo(item, &itemType, &typeText, &name, &unit, &unitText, &dataType);
    keepText(typeText);
    keepText(name);
    keepText(unitText);
    grdGetItemInfo_(item, &itemType, &name, &unitText, &dataType);
    keepText(name);
    keepText(unitText);
    grdGetItemValueType(item, &valueType);
    grdGetItemUnitConversion(item, &mode, &convUnit);
    grdGetItemAxisUnitConversion(item, &mode, &convUnit);
    float a = 0, b = 0, c = 0;
    grdGetItemAxisOrientation(item, &a, &b, &c);
    grdGetItemRefCoords(item, &a, &b, &c);
    int32_t length = 0;
    grdIsItemCompressed(item, &length);
    keepValues(itemType, unit, dataType, mode, convUnit, valueType, a, b, c, length, grdGetItemGeometryType(item),
               grdGetItemGeometryUnit(item), grdGetItemDim(item), grdGetItemXSize(item), grdGetItemXYSize(item),
               grdGetItemXYZSize(item), grdGetItemElements(item), grdGetUsedItemElements(item),
               grdGetItemBytes(item), grdGetUsedItemBytes(item));
    double minimum = 0, maximum = 0;
    int32_t deletes = 0;
    if (grdGetItemStatsGlobal(item, &minimum, &maximum, &deletes) == 0) keepValues(minimum, maximum, deletes);
    queryAxis(item);
}

inline void queryTimeAxis(HeaderHandle h) {
    int32_t unit = 0, steps = 0, first = 0;
    const char *unitText = nullptr, *date = nullptr, *time = nullptr;
    double start = 0, step = 0, offset = 0, span = 0;
    switch (grdGetTimeAxisType(h)) {
        case F_TM_EQ_AXIS: grdGetEqTimeAxis(h, &unit, &unitText, &start, &step, &steps, &first); break;
        case F_TM_NEQ_AXIS: grdGetNeqTimeAxis(h, &unit, &unitText, &start, &step, &steps, &first); break;
        case F_CAL_EQ_AXIS:
            grdGetEqCalendarAxis(h, &unit, &unitText, &date, &time, &offset, &step, &steps, &first);
            break;
        case F_CAL_NEQ_AXIS:
            grdGetNeqCalendarAxis(h, &unit, &unitText, &date, &time, &offset, &step, &steps, &first);
            break;
        default: break;
    }
    keepText(unitText);
    keepText(date);
    keepText(time);
    _grdGetTimeAxisSpan(h, nullptr, &span);
    keepValues(unit, steps, first, start, step, offset, span);
}

inline void queryHeader(HeaderHandle h, size_t fileSize) {
    keepText(grdGetFileTitle(h));
    keepText(grdGetAppTitle(h));
    keepText(grdFileTypeStr(grdGetFileType(h)));
    keepValues(grdGetAppVersionNo(h), grdGetDataType(h), grdGetItemStatsType(h), grdGetDeleteValFloat(h),
               grdGetDeleteValDouble(h), grdGetDeleteValByte(h), grdGetDeleteValInt(h),
               grdGetDeleteValUnsignedInt(h), grdGetGeoInfoType(h), grdIsFileCompressed(h));
    const char* projection = nullptr;
    double lon = 0, lat = 0, orientation = 0;
    if (grdGetGeoInfoUTMProj(h, &projection, &lon, &lat, &orientation) == 0) keepText(projection);

    // Custom blocks: a chain no longer than the file could describe.
    CustomBlockHandle block = nullptr;
    grdGetCustomBlockRef(h, &block);
    for (size_t n = 0; block != nullptr; ++n) {
        if (n > fileSize) fuzz::broken("the custom-block chain does not end");
        int32_t type = 0, count = 0;
        const char* name = nullptr;
        const void* data = nullptr;
        CustomBlockHandle next = nullptr;
        if (grdGetCustomBlock(block, &type, &name, &count, &data, &next) != 0) break;
        keepText(name);
        const int32_t width = grdSimpleTypeSize(type);
        if (data != nullptr && count > 0 && width > 0) fuzz::keep(fuzz::touch(data, size_t(count) * size_t(width)));
        block = next;
    }

    // Encoding keys: one buffer per key of the key length each.
    const int32_t keyLength = grdGetEncodeKeySize(h);
    if (keyLength < 0 || uint64_t(keyLength) * 4 > fileSize) fuzz::broken("an encoding key longer than the file");
    if (keyLength > 0) {
        std::vector<int32_t> keys(size_t(keyLength) * 3);
        grdGetEncodeKey(h, keys.data(), keys.data() + keyLength, keys.data() + 2 * keyLength);
        fuzz::keep(fuzz::touch(keys.data(), keys.size() * 4));
    }
    queryTimeAxis(h);

    const int32_t items = grdGetNoOfItems(h);
    for (int32_t i = 1; i <= items; ++i) {
        ItemHandle item = grdItemD(h, i);
        if (item == nullptr) fuzz::broken("an item in range has no handle");
        queryItem(item);
        const int32_t assoc = grdGetNoAssocStatic(h, i);
        for (int32_t k = 1; k <= std::min(assoc, 8) + 1; ++k) {
            int32_t staticNo = 0;
            grdGetAssocStatic(h, i, k, &staticNo);
            keepValues(staticNo);
        }
    }
}

// Bytes that a read of the item fills: its full element count (the grid of a
// compressed item) times the element width; -1 when too large to hand over.
inline int64_t readBytes(ItemHandle item) {
    int32_t dataType = 0;
    grdGetItemInfo_(item, nullptr, nullptr, nullptr, &dataType);
    const int64_t elements = grdGetItemElements(item);
    const int64_t bytes = elements * grdSimpleTypeSize(dataType);
    return bytes > 0 && bytes <= kMaxBuffer ? bytes : -1;
}

inline void readStaticItems(FileHandle f, size_t fileSize) {
    for (size_t n = 0;; ++n) {
        if (n > fileSize) fuzz::broken("static items do not end");
        int32_t status = -1;
        ItemHandle item = grdStaticRead(f, &status);
        if (item == nullptr) return;
        if (status != 0) fuzz::broken("a static item came with a failure");
        queryItem(item);
        int32_t dataType = 0;
        grdGetItemInfo_(item, nullptr, nullptr, nullptr, &dataType);
        const int64_t bytes = int64_t{grdGetUsedItemElements(item)} * grdSimpleTypeSize(dataType);
        if (bytes > 0 && bytes <= kMaxBuffer) {
            std::vector<unsigned char> values(static_cast<size_t>(bytes));
            if (grdStaticGetData(item, values.data()) == 0) {
                // What was copied: no more than the item holds.
                const int64_t held = std::min<int64_t>(grdAsStatic(item)->valueBytes, bytes);
                fuzz::keep(fuzz::touch(values.data(), static_cast<size_t>(held)));
            }
        }
        if (grdStaticDestroy(&item) != 0 || item != nullptr) fuzz::broken("a static item did not destroy");
    }
}

// Reads the item under the cursor with conversion mode `mode` (0-3), into a
// buffer of exactly the size promised, or without one.
inline int32_t readOne(HeaderHandle h, FileHandle f, int32_t mode) {
    int32_t next = 0, done = 0;
    grdGetItemCursor(h, &next, &done);
    ItemHandle item = grdItemD(h, next);
    if (item == nullptr) return grdReadItemTimeStep(h, f, nullptr, nullptr);
    int32_t itemType = 0, unit = 0;
    grdGetItemInfo(item, &itemType, nullptr, nullptr, &unit, nullptr, nullptr);
    grdSetItemUnitConversion(item, mode, unit);
    const int64_t bytes = readBytes(item);
    double time = 0;
    int32_t status = 0;
    if (bytes < 0) {
        status = grdReadItemTimeStep(h, f, &time, nullptr);
    } else {
        std::vector<unsigned char> values(static_cast<size_t>(bytes));
        status = grdReadItemTimeStep(h, f, &time, values.data());
        if (status == 0) fuzz::keep(fuzz::touch(values.data(), values.size()));
    }
    keepValues(time);
    grdSetItemUnitConversion(item, 0, unit);
    return status;
}

// Reads every time step of every item in order: items in turn in each
// conversion mode; every fifth item skipped, every seventh step skipped
// whole. Stops at the first failure (the end of the data).
inline void readDynamic(HeaderHandle h, FileHandle f, int32_t& calls) {
    if (grdFindBlockDynamic(h, f) != 0) return;
    const int32_t items = grdGetNoOfItems(h);
    for (int32_t step = 0; calls < kMaxDynamicCalls; ++step) {
        ++calls;
        if (step % 7 == 6) {
            if (grdSkipTimeStep(h, f) != 0) return;
            continue;
        }
        for (int32_t i = 1; i <= items && calls < kMaxDynamicCalls; ++i, ++calls) {
            const int32_t status = (step + i) % 5 == 4 ? grdSkipItem(h, f) : readOne(h, f, (step + i) % 4);
            if (status != 0) return;
        }
    }
}

inline void queryStatistics(HeaderHandle h) {
    const int32_t items = grdGetNoOfItems(h);
    for (int32_t i = 1; i <= items; ++i) {
        const int32_t used = grdGetUsedItemElements(grdItemD(h, i));
        for (int32_t e : {-1, 0, used / 2, used - 1, used}) {
            double v[5] = {};
            int32_t n[3] = {};
            if (grdGetItemStats(h, i, e, &v[0], &v[1], &v[2], &v[3], &v[4], &n[0], &n[1], &n[2]) == 0) {
                keepValues(v, n);
            }
        }
    }
}

// A few searches and a read after each.
inline void search(HeaderHandle h, FileHandle f, int32_t& calls) {
    int32_t unit = 0, steps = 0, first = 0;
    double start = 0, step = 0, offset = 0;
    const char *unitText = nullptr, *date = nullptr, *time = nullptr;
    switch (grdGetTimeAxisType(h)) {
        case F_TM_EQ_AXIS: grdGetEqTimeAxis(h, &unit, &unitText, &start, &step, &steps, &first); break;
        case F_TM_NEQ_AXIS: grdGetNeqTimeAxis(h, &unit, &unitText, &start, &step, &steps, &first); break;
        case F_CAL_EQ_AXIS: grdGetEqCalendarAxis(h, &unit, &unitText, &date, &time, &offset, &step, &steps, &first); break;
        case F_CAL_NEQ_AXIS:
            grdGetNeqCalendarAxis(h, &unit, &unitText, &date, &time, &offset, &step, &steps, &first);
            break;
        default: break;
    }
    const int32_t items = grdGetNoOfItems(h);
    for (int32_t t : {steps - 1, 0, steps / 2, steps, steps > 6 ? 6 : 1}) {
        if (++calls > kMaxDynamicCalls) return;
        if (grdFindTimeStep(h, f, t) == 0) readOne(h, f, 0);
        if (items > 0 && grdFindItemDynamic(h, f, t, items - (t & 1)) == 0) readOne(h, f, 1);
    }
    grdFindBlockStatic(h, f);
    for (int32_t n : {2, 1, 3}) {
        if (grdFindItemStatic(h, f, n) == 0) {
            int32_t status = 0;
            ItemHandle item = grdStaticRead(f, &status);
            if (item != nullptr) grdStaticDestroy(&item);
        }
    }
    grdFindBlock(f, 50000);
}

// Everything above on an open file, which is left open.
inline void readWholeFile(HeaderHandle h, FileHandle f, size_t fileSize) {
    queryHeader(h, fileSize);
    readStaticItems(f, fileSize);
    int32_t calls = 0;
    readDynamic(h, f, calls);
    queryStatistics(h);
    search(h, f, calls);
}

}  // namespace grdread
