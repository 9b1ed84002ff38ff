// `tova stats FILE [--item ITEM]... [--time WHEN] [--x A:B] [--y A:B] [--z A:B]
// [--json]`: minimum, maximum, mean and the number of delete values of each
// item, computed by reading every selected time step; over the whole file
// next to the statistics the file stores (the item's extremes and delete
// count, and with per-element statistics the mean), and whether the two
// agree. A file that turns out damaged gives the statistics of the time
// steps read before the damage and what `check` says of it.
#include <algorithm>
#include <cmath>
#include <cstring>
#include <limits>
#include <vector>

#include "grd_access.h"
#include "grd_commands.h"
#include "progress.h"
#include "selection.h"
#include "text.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

struct Accumulator {
    int64_t values = 0;
    int64_t deletes = 0;
    double minimum = std::numeric_limits<double>::infinity();
    double maximum = -std::numeric_limits<double>::infinity();
    double sum = 0;
    double compensation = 0;  // Kahan summation keeps the mean exact over millions of values

    void add(double x) {
        minimum = std::min(minimum, x);
        maximum = std::max(maximum, x);
        const double y = x - compensation;
        const double t = sum + y;
        compensation = (t - sum) - y;
        sum = t;
        ++values;
    }
    double mean() const { return values > 0 ? sum / static_cast<double>(values) : std::nan(""); }
};

// Adds the stored elements of one time step in the box: all of them, or for
// a compressed item those at the key positions.
template <class T>
void accumulate(Accumulator& acc, const unsigned char* data, const Box& box, const std::vector<int64_t>& positions,
                bool hasDelete, T deleteValue) {
    const auto one = [&](int64_t e) {
        T v;
        std::memcpy(&v, data + static_cast<size_t>(e) * sizeof(T), sizeof(T));
        if (hasDelete && v == deleteValue) {
            ++acc.deletes;
        } else {
            acc.add(static_cast<double>(v));
        }
    };
    if (positions.empty()) {
        box.forEachRun([&](int64_t first, int64_t length) {
            for (int64_t e = first; e < first + length; ++e) one(e);
        });
    } else {
        for (const int64_t e : positions) {
            if (box.whole() || box.contains(e)) one(e);
        }
    }
}

struct ItemWork {
    int32_t number = 0;
    int32_t type = 0;
    Box box;
    std::vector<int64_t> positions;  // grid positions of the stored elements of a compressed item
    Accumulator acc;
    std::vector<unsigned char> values;  // of the time step being read
};

void addTo(ItemWork& w, HeaderHandle h, const unsigned char* data) {
    switch (w.type) {
    case RCF_FLOAT: return accumulate<float>(w.acc, data, w.box, w.positions, true, grdGetDeleteValFloat(h));
    case RCF_DOUBLE: return accumulate<double>(w.acc, data, w.box, w.positions, true, grdGetDeleteValDouble(h));
    case RCF_BYTE:
        return accumulate<signed char>(w.acc, data, w.box, w.positions, true,
                                       static_cast<signed char>(grdGetDeleteValByte(h)));
    case RCF_INT4: return accumulate<int32_t>(w.acc, data, w.box, w.positions, true, grdGetDeleteValInt(h));
    case RCF_UINT4:
        return accumulate<uint32_t>(w.acc, data, w.box, w.positions, true, grdGetDeleteValUnsignedInt(h));
    case RCF_INT2: return accumulate<int16_t>(w.acc, data, w.box, w.positions, false, int16_t{0});
    case RCF_UINT2: return accumulate<uint16_t>(w.acc, data, w.box, w.positions, false, uint16_t{0});
    default: break;
    }
}

// Grid positions of the stored elements of a compressed item (key order).
std::vector<int64_t> keyPositions(HeaderHandle h, ItemHandle item, const Geometry& g) {
    const int32_t length = grdGetEncodeKeySize(h);
    const int32_t used = grdGetUsedItemElements(item);
    if (grdIsFileCompressed(h) == 0 || length <= 0 || used >= g.elements) return {};
    const auto n = static_cast<size_t>(length);
    std::vector<int32_t> x(n, 0), y(n, 0), z(n, 0);
    grdGetEncodeKey(h, x.data(), y.data(), z.data());
    const int64_t nx = g.dims >= 1 ? g.size[0] : 1;
    const int64_t ny = g.dims >= 2 ? g.size[1] : 1;
    std::vector<int64_t> positions;
    positions.reserve(static_cast<size_t>(used));
    for (size_t i = 0; i < static_cast<size_t>(used) && i < n; ++i) {
        const int64_t e = int64_t{z[i]} * nx * ny + int64_t{y[i]} * nx + x[i];
        if (e >= 0 && e < g.elements) positions.push_back(e);
    }
    return positions;
}

Value number(double d) { return std::isfinite(d) ? Value(d) : Value(nullptr); }

// An extreme of an item's values: float items show it as the float it is.
Value extreme(double d, int32_t type) {
    if (!std::isfinite(d)) return nullptr;
    return type == RCF_FLOAT ? floatValue(static_cast<float>(d)) : Value(d);
}

// The statistics the file stores for item n; whether they agree with acc.
Value stored(HeaderHandle h, int32_t n, const Accumulator& acc, bool* agrees) {
    const ItemHandle item = grdItemD(h, n);
    const double none = grdGetDeleteValDouble(h);
    double minimum = none, maximum = none;
    int32_t deletes = 0;
    grdGetItemStatsGlobal(item, &minimum, &maximum, &deletes);
    const bool hasExtremes = minimum != none && maximum != none;

    const double mean = storedMean(h, n);

    *agrees = deletes == acc.deletes && (hasExtremes ? minimum == acc.minimum && maximum == acc.maximum : acc.values == 0);
    if (std::isfinite(mean) && acc.values > 0) {
        const double scale = std::max({1.0, std::fabs(acc.minimum), std::fabs(acc.maximum)});
        *agrees = *agrees && std::fabs(mean - acc.mean()) <= 1e-9 * scale;
    }

    Value row = Value::object();
    row.add("item", n);
    const int32_t dataType = itemInfo(item).dataType;
    row.add("minimum", hasExtremes ? extreme(minimum, dataType) : Value(nullptr));
    row.add("maximum", hasExtremes ? extreme(maximum, dataType) : Value(nullptr));
    row.add("mean", number(mean));
    row.add("deletes", deletes);
    row.add("agrees", *agrees);
    return row;
}

}  // namespace

int runStats(const StatsOptions& options) {
    const RecordFileInfo file = probeGridFile(options.file);
    int32_t opened = 0;
    const GridFile grid(options.file, &opened);
    if (opened != F_NO_ERROR) {
        return reportDamage(options.file, options.file + ": the gridded data-file reader refuses the file: status " +
                                              statusText(opened));
    }
    const HeaderHandle h = grid.header();
    const FileHandle f = grid.file();
    const TimeAxis axis = timeAxis(h);
    const StepSpan steps = selectSteps(grid, axis, options.select.time, options.select.nearest, options.file);

    std::vector<ItemWork> work;
    for (const int32_t n : selectItems(h, options.select.items, options.file)) {
        const ItemHandle item = grdItemD(h, n);
        const Geometry g = itemGeometry(item);
        const ItemInfo info = itemInfo(item);
        ItemWork w{n, info.dataType, Box(g, options.select.axes, "item " + std::to_string(n) + " \"" + info.name + "\""),
                   {}, {}, {}};
        const size_t bytes = valueBytes(g.elements, w.type, file.size, options.file + ": item " + std::to_string(n));
        w.positions = keyPositions(h, item, g);
        w.values.resize(std::max<size_t>(bytes, 8));
        work.push_back(std::move(w));
    }

    // Steps are read in file order and items in their order within a step.
    std::vector<ItemWork*> order;
    for (ItemWork& w : work) order.push_back(&w);
    std::sort(order.begin(), order.end(), [](const ItemWork* a, const ItemWork* b) { return a->number < b->number; });
    Progress progress("reading", file.size);
    std::string failure;
    int64_t done = 0;
    try {
        for (int64_t t = steps.first; t <= steps.last; ++t, ++done) {
            const auto step = static_cast<int32_t>(t);
            for (ItemWork* w : order) {
                const std::string where = options.file + ": time step " + std::to_string(t) + ", item " + std::to_string(w->number);
                const int32_t found = grdFindItemDynamic(h, f, step, w->number);
                if (found != F_NO_ERROR) throw Failure(where + ": status " + statusText(found));
                double time = 0;
                const int32_t status = grdReadItemTimeStep(h, f, &time, w->values.data());
                if (status != F_NO_ERROR) throw Failure(where + ": status " + statusText(status));
                progress.update(static_cast<uint64_t>(std::max<int64_t>(rcfTell64(f), 0)));
            }
            // A step counts once it was read whole.
            for (ItemWork& w : work) addTo(w, h, w.values.data());
        }
    } catch (const Failure& e) {
        failure = e.what();
    }
    // The stored statistics describe every value of every step.
    bool whole = failure.empty() && steps.first == 0 && steps.last == axis.timeSteps - 1;
    for (const ItemWork& w : work) whole = whole && w.box.whole();

    Value doc = Value::object();
    doc.add("file", options.file);
    doc.add("timeSteps", done);
    if (done > 0) {
        Value& read = doc.add("stepsRead", Value::array());
        read.push(steps.first);
        read.push(steps.first + done - 1);
    }
    doc.add("statisticsType", grdGetItemStatsType(h));
    Value computed = Value::array();
    Value kept = Value::array();
    bool allAgree = true;
    for (const ItemWork& w : work) {
        const ItemInfo info = itemInfo(grdItemD(h, w.number));
        Value& row = computed.push(Value::object());
        row.add("item", w.number);
        row.add("name", info.name);
        row.add("unit", info.unitText);
        row.add("values", w.acc.values);
        row.add("deletes", w.acc.deletes);
        row.add("minimum", extreme(w.acc.values > 0 ? w.acc.minimum : std::nan(""), w.type));
        row.add("maximum", extreme(w.acc.values > 0 ? w.acc.maximum : std::nan(""), w.type));
        row.add("mean", number(w.acc.mean()));
        if (whole) {
            bool agrees = false;
            kept.push(stored(h, w.number, w.acc, &agrees));
            allAgree = allAgree && agrees;
        }
    }
    doc.add("computed", std::move(computed));
    if (whole) doc.add("stored", std::move(kept));
    if (!allAgree) {
        doc.add("note", "the stored statistics differ from the values read: the data may have been changed after "
                        "they were written");
    }
    if (!failure.empty()) {
        doc.add("note", "the file is damaged: these are the statistics of the time steps before the damage");
    }
    printOut(options.json ? toJson(doc) : toText(doc));
    return failure.empty() ? kExitOk : reportDamage(options.file, failure);
}

}  // namespace tova_cli
