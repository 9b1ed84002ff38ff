// Test support for the hardening tests (damaged files, failing allocations,
// failing writes): a small but rich data file written through the API, and a
// reader that goes through everything a file holds with the API, keeping
// every status instead of asserting, so that each test decides what a
// damaged run must show.
#pragma once

#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "qty/qty.h"
#include "tova/grd.h"

namespace hardtest {

constexpr int32_t kWaterLevel = 40101;
constexpr int32_t kMetre = 20100;
constexpr int32_t kRichSteps = 3;

// The value of element e of item i at step s (exact in float).
inline double richValue(int32_t s, int32_t i, int64_t e) {
    return s * 100.0 + i * 10.0 + static_cast<double>(e) * 0.25;
}

// The statuses of a run: every call's status in order, and the first failure.
struct Run {
    std::vector<int32_t> statuses;
    int32_t firstFailure = 0;

    // Records a status; returns true when it is a success.
    bool note(int32_t status) {
        statuses.push_back(status);
        if (status != 0 && firstFailure == 0) firstFailure = status;
        return status == 0;
    }
    bool ok() const { return firstFailure == 0; }
};

// A header of file type 4 on a non-equidistant calendar axis, per-element
// statistics, compressed through x and y keys (5 of the 12 points of a 4 x 3
// grid): a compressed float grid (water level in metres), a double profile on
// a non-equidistant 1-D axis and a single float value, a projection and a
// custom block. Null when a call fails (statuses in run).
inline HeaderHandle richHeader(Run& run) {
    HeaderHandle h = nullptr;
    if (!run.note(grdHeaderCreate(F_NEQTIME_FIXEDSPACE_ALLITEMS, "rich", "tests", 2, 3, F_ITEM_STATS_ELEMENT, &h)))
        return nullptr;
    const int32_t xKey[5] = {0, 3, 1, 2, 0};
    const int32_t yKey[5] = {0, 0, 1, 2, 2};
    const double xs[4] = {0.0, 1.0, 3.0, 7.5};
    const int32_t marks[2] = {7, -1};
    const bool ok = run.note(grdSetNeqCalendarAxis(h, "2020-02-28", "23:00:00", QTY_UNIT_SECOND, 0.0, 0)) &&
                    run.note(grdSetGeoInfoUTMProj(h, "UTM-32", 9.0, 54.5, 0.0)) &&
                    run.note(grdAddCustomBlock(h, RCF_INT4, "marks", 2, marks)) &&
                    run.note(grdSetEncodeKey(h, xKey, yKey, nullptr, 5)) &&
                    run.note(grdSetItemInfo(h, grdItemD(h, 1), kWaterLevel, "level", kMetre, RCF_FLOAT)) &&
                    run.note(grdSetItemAxisEqD2(grdItemD(h, 1), 0, 4, 3, 0.0f, 0.0f, 1.0f, 1.0f)) &&
                    run.note(grdSetItemInfo(h, grdItemD(h, 2), QTY_ITEM_UNDEFINED, "profile", 0, RCF_DOUBLE)) &&
                    run.note(grdSetItemAxisNeqD1(grdItemD(h, 2), 0, 3, xs, 0)) &&
                    run.note(grdSetItemInfo(h, grdItemD(h, 3), QTY_ITEM_UNDEFINED, "gauge", 0, RCF_FLOAT)) &&
                    run.note(grdSetItemAxisEqD0(grdItemD(h, 3), 0));
    if (!ok) grdHeaderDestroy(&h);
    return h;
}

// The values of item i at step s as the bytes of its data type, full grid.
inline std::vector<unsigned char> richValues(HeaderHandle h, int32_t s, int32_t i) {
    ItemHandle item = grdItemD(h, i);
    int32_t dataType = 0;
    grdGetItemInfo_(item, nullptr, nullptr, nullptr, &dataType);
    const int64_t n = grdGetItemElements(item);
    const size_t width = dataType == RCF_DOUBLE ? 8 : 4;
    std::vector<unsigned char> bytes(static_cast<size_t>(n) * width);
    for (int64_t e = 0; e < n; ++e) {
        const double v = richValue(s, i, e);
        const float f = static_cast<float>(v);
        std::memcpy(bytes.data() + e * width, width == 8 ? static_cast<const void*>(&v) : &f, width);
    }
    return bytes;
}

// One static item of 3 doubles 1, 2, 3 on a 1-D axis.
inline bool writeRichStatic(Run& run, HeaderHandle h, FileHandle f) {
    ItemHandle item = nullptr;
    if (!run.note(grdStaticCreate(&item))) return false;
    const double values[3] = {1.0, 2.0, 3.0};
    const bool ok = run.note(grdSetItemInfo(h, item, QTY_ITEM_UNDEFINED, "depth", 0, RCF_DOUBLE)) &&
                    run.note(grdSetItemAxisEqD1(item, 0, 3, 0.0f, 1.0f)) &&
                    run.note(grdStaticWrite(item, f, values));
    grdStaticDestroy(&item);
    return ok;
}

// Writes steps time steps (times 0, 1800, 5400, ...) of the rich header's
// items; stops at the first failure.
inline bool writeRichSteps(Run& run, HeaderHandle h, FileHandle f, int32_t steps) {
    for (int32_t s = 0; s < steps; ++s) {
        for (int32_t i = 1; i <= grdGetNoOfItems(h); ++i) {
            const std::vector<unsigned char> values = richValues(h, s, i);
            if (!run.note(grdWriteItemTimeStep(h, f, 1800.0 * s * (s + 1) / 2, values.data()))) return false;
        }
    }
    return true;
}

// Writes the rich file at path: header, one static item, kRichSteps time
// steps, close. Whatever fails, everything is closed and freed; a file that
// did not close is released through the record layer.
inline Run writeRichFile(const std::string& path) {
    Run run;
    HeaderHandle h = richHeader(run);
    if (h == nullptr) return run;
    FileHandle f = nullptr;
    if (run.note(grdFileCreate(path.c_str(), h, &f))) {
        if (writeRichStatic(run, h, f)) writeRichSteps(run, h, f, kRichSteps);
        run.note(grdFileClose(h, &f));
        if (f != nullptr) rcfFileClose(&f);
    }
    grdHeaderDestroy(&h);
    return run;
}

// What a reader got out of a file.
struct Contents {
    Run run;
    int32_t staticItems = 0;
    int32_t stepsRead = 0;                  // complete time steps
    std::vector<std::vector<unsigned char>> values;  // per item read, in order
    std::vector<double> times;              // per item read
};

// Opens path for reading and goes through everything with the API: header
// getters, every static item with its values, every time step the header
// counts (each item into a buffer of its full grid), the statistics, two
// searches, the close. Stops reading at the first failure, closes and frees
// what it holds in every case.
inline Contents readEverything(const std::string& path) {
    Contents c;
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    if (!c.run.note(grdFileRead(path.c_str(), &h, &f))) return c;
    const int32_t items = grdGetNoOfItems(h);
    int32_t unit = 0, steps = 0, first = 0;
    const char *unitText = nullptr, *date = nullptr, *time = nullptr;
    double offset = 0, span = 0;
    bool ok = true;
    if (grdGetTimeAxisType(h) == F_CAL_NEQ_AXIS)
        ok = c.run.note(grdGetNeqCalendarAxis(h, &unit, &unitText, &date, &time, &offset, &span, &steps, &first));
    for (int32_t i = 1; i <= items; ++i) grdGetItemInfo(grdItemD(h, i), nullptr, nullptr, nullptr, nullptr, nullptr, nullptr);

    while (ok) {
        int32_t status = 0;
        ItemHandle item = grdStaticRead(f, &status);
        ok = c.run.note(status);
        if (item == nullptr) break;
        ++c.staticItems;
        int32_t dataType = 0;
        grdGetItemInfo_(item, nullptr, nullptr, nullptr, &dataType);
        std::vector<unsigned char> values(static_cast<size_t>(grdGetUsedItemBytes(item)) + 1);
        ok = c.run.note(grdStaticGetData(item, values.data()));
        grdStaticDestroy(&item);
    }
    for (int32_t s = 0; ok && s < steps; ++s) {
        for (int32_t i = 1; ok && i <= items; ++i) {
            ItemHandle item = grdItemD(h, i);
            std::vector<unsigned char> values(static_cast<size_t>(grdGetItemBytes(item)));
            double t = 0;
            ok = c.run.note(grdReadItemTimeStep(h, f, &t, values.data()));
            if (ok) {
                c.values.push_back(std::move(values));
                c.times.push_back(t);
            }
        }
        if (ok) ++c.stepsRead;
    }
    for (int32_t i = 1; ok && i <= items; ++i) {
        double minimum = 0, maximum = 0, mean = 0;
        int32_t deletes = 0;
        ok = c.run.note(grdGetItemStatsGlobal(grdItemD(h, i), &minimum, &maximum, &deletes)) &&
             c.run.note(grdGetItemStats(h, i, 0, &minimum, &maximum, &mean, nullptr, nullptr, nullptr, nullptr,
                                        nullptr));
    }
    if (ok && steps > 0) {
        ok = c.run.note(grdFindTimeStep(h, f, steps - 1)) && c.run.note(grdFindItemDynamic(h, f, 0, items));
    }
    c.run.note(grdFileClose(h, &f));
    if (f != nullptr) rcfFileClose(&f);
    grdHeaderDestroy(&h);
    return c;
}

}  // namespace hardtest
