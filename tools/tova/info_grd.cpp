// The gridded-data part of `tova info`: file type, titles, application, data
// type, statistics type, compression, delete values, projection, the time
// axis with the time of its last step, every item with its quantity, unit and
// axis, the static items and the custom blocks, all read through the
// gridded data-file API.
#include <algorithm>
#include <cmath>

#include "grd_access.h"
#include "grd_commands.h"
#include "selection.h"
#include "tova/rcf.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

// Values of a custom block shown in the summary; the count says how many
// there are in all.
constexpr int32_t kShownValues = 6;

Value deleteValues(HeaderHandle h) {
    Value v = Value::object();
    v.add("float", floatValue(grdGetDeleteValFloat(h)));
    v.add("double", grdGetDeleteValDouble(h));
    v.add("byte", static_cast<int>(static_cast<signed char>(grdGetDeleteValByte(h))));
    v.add("int", grdGetDeleteValInt(h));
    v.add("unsigned", grdGetDeleteValUnsignedInt(h));
    return v;
}

Value projection(HeaderHandle h) {
    const int32_t type = grdGetGeoInfoType(h);
    if (type == F_UNDEFINED_GEOINFO) return nullptr;
    Value v = Value::object();
    v.add("type", type);
    const char* text = nullptr;
    double longitude = 0, latitude = 0, orientation = 0;
    if (type == F_UTM_PROJECTION && grdGetGeoInfoUTMProj(h, &text, &longitude, &latitude, &orientation) == 0) {
        v.add("name", text != nullptr ? text : "");
        v.add("longitude", longitude);
        v.add("latitude", latitude);
        v.add("orientation", orientation);
    }
    return v;
}

Value timeAxisValue(HeaderHandle h) {
    const TimeAxis axis = timeAxis(h);
    Value v = Value::object();
    v.add("type", axis.type);
    v.add("kind", grdTimeAxisTypeStr(axis.type));
    if (axis.type < F_TM_EQ_AXIS || axis.type > F_CAL_NEQ_AXIS) return v;
    v.add("unit", axis.unitText);
    v.add("unitKey", axis.unit);
    if (axis.calendar) {
        v.add("startDate", axis.startDate);
        v.add("startTime", axis.startTime);
        v.add("startOffset", axis.start);
    } else {
        v.add("start", axis.start);
    }
    if (axis.equidistant) {
        v.add("step", axis.step);
    } else {
        v.add("span", axis.step);
    }
    v.add("timeSteps", axis.timeSteps);
    v.add("firstIndex", axis.firstIndex);
    // The time of the last time step.
    if (axis.timeSteps > 0) {
        const std::string end = axis.text(axis.lastOffset());
        if (axis.calendar) {
            v.add("end", end);
        } else {
            v.add("end", axis.start + axis.lastOffset());
        }
    } else {
        v.add("end", nullptr);
    }
    return v;
}

// Columns shared by the item and static-item tables.
void addItemColumns(Value& row, ItemHandle item) {
    const ItemInfo info = itemInfo(item);
    const Geometry g = itemGeometry(item);
    row.add("name", info.name);
    row.add("quantity", info.quantityText);
    row.add("quantityKey", info.quantity);
    row.add("unit", info.unitText);
    row.add("unitKey", info.unit);
    row.add("dataType", typeName(info.dataType));
    row.add("axis", axisName(g.type));
    row.add("sizes", sizesValue(g));
    row.add("origin", originValue(g));
    row.add("step", stepValue(g));
    row.add("axisUnit", g.unitText);
    row.add("elements", g.elements);
}

// How many of a dynamic item's elements are stored, and whether compressed.
void addStorage(Value& row, ItemHandle item) {
    int32_t keyLength = 0;
    grdIsItemCompressed(item, &keyLength);
    row.add("stored", grdGetUsedItemElements(item));
    row.add("compressed", keyLength > 0);
}

Value items(HeaderHandle h) {
    Value rows = Value::array();
    const int32_t n = grdGetNoOfItems(h);
    for (int32_t i = 1; i <= n; ++i) {
        const ItemHandle item = grdItemD(h, i);
        Value& row = rows.push(Value::object());
        row.add("item", i);
        addItemColumns(row, item);
        addStorage(row, item);
    }
    return rows;
}

// The static items after the encoding keys (which the reader has taken).
Value staticItems(const GridFile& grid, std::string* failure) {
    Value rows = Value::array();
    for (int32_t n = 1;; ++n) {
        int32_t status = 0;
        const StaticPtr item = readStatic(grid.file(), &status);
        if (!item) {
            if (status != F_NO_ERROR) *failure = "static item " + std::to_string(n) + ": status " + statusText(status);
            break;
        }
        Value& row = rows.push(Value::object());
        row.add("static", n);
        addItemColumns(row, item.get());
    }
    return rows;
}

template <class T>
void pushValues(Value& values, const void* data, int32_t count) {
    const auto* p = static_cast<const T*>(data);
    for (int32_t i = 0; i < count; ++i) {
        if constexpr (std::is_same_v<T, float>) {
            values.push(floatValue(p[i]));
        } else {
            values.push(p[i]);
        }
    }
}

Value customBlocks(HeaderHandle h) {
    Value rows = Value::array();
    CustomBlockHandle block = nullptr;
    grdGetCustomBlockRef(h, &block);
    // A damaged chain cannot loop: the header owns a plain list.
    while (block != nullptr) {
        int32_t type = 0, count = 0;
        const char* name = nullptr;
        const void* data = nullptr;
        CustomBlockHandle next = nullptr;
        if (grdGetCustomBlock(block, &type, &name, &count, &data, &next) != F_NO_ERROR) break;
        Value& row = rows.push(Value::object());
        row.add("name", name != nullptr ? name : "");
        row.add("type", typeName(type));
        row.add("count", count);
        Value values = Value::array();
        const int32_t shown = data != nullptr ? std::clamp(count, 0, kShownValues) : 0;
        switch (type) {
        case RCF_FLOAT: pushValues<float>(values, data, shown); break;
        case RCF_DOUBLE: pushValues<double>(values, data, shown); break;
        case RCF_BYTE: pushValues<signed char>(values, data, shown); break;
        case RCF_INT4: pushValues<int32_t>(values, data, shown); break;
        case RCF_UINT4: pushValues<uint32_t>(values, data, shown); break;
        case RCF_INT2: pushValues<int16_t>(values, data, shown); break;
        case RCF_UINT2: pushValues<uint16_t>(values, data, shown); break;
        default: break;
        }
        row.add("values", std::move(values));
        block = next;
    }
    return rows;
}

// The coordinates of an axis, per direction: equidistant axes their first
// and last cell and step, non-equidistant ones their cell boundaries,
// curvilinear ones the extent of their nodes.
Value axisCoordinates(const Geometry& g, ItemHandle item) {
    static const char* const kNames[] = {"x", "y", "z", "w"};
    Value v = Value::object();
    if (g.equidistant) {
        for (int32_t d = 0; d < g.dims; ++d) {
            Value& c = v.add(kNames[d], Value::object());
            c.add("first", floatValue(g.origin[d]));
            c.add("last", g.size[d] > 0 ? Value(static_cast<double>(g.origin[d]) + (g.size[d] - 1) * static_cast<double>(g.step[d]))
                                        : Value(nullptr));
            c.add("step", floatValue(g.step[d]));
        }
        return v;
    }
    const char* unitText = nullptr;
    int32_t unit = 0, s[3] = {};
    const double* c[3] = {};
    switch (g.type) {
    case F_NEQ_AXIS_D1: grdGetItemAxisNeqD1(item, &unit, &unitText, &s[0], &c[0]); break;
    case F_NEQ_AXIS_D2: grdGetItemAxisNeqD2(item, &unit, &unitText, &s[0], &s[1], &c[0], &c[1]); break;
    case F_NEQ_AXIS_D3: grdGetItemAxisNeqD3(item, &unit, &unitText, &s[0], &s[1], &s[2], &c[0], &c[1], &c[2]); break;
    case F_CURVE_LINEAR_AXIS_D2: grdGetItemAxisCurveLinearD2(item, &unit, &unitText, &s[0], &s[1], &c[0], &c[1]); break;
    case F_CURVE_LINEAR_AXIS_D3:
        grdGetItemAxisCurveLinearD3(item, &unit, &unitText, &s[0], &s[1], &s[2], &c[0], &c[1], &c[2]);
        break;
    default: return nullptr;
    }
    const bool curvilinear = g.type == F_CURVE_LINEAR_AXIS_D2 || g.type == F_CURVE_LINEAR_AXIS_D3;
    int64_t nodes = 1;
    for (int32_t d = 0; d < g.dims; ++d) nodes *= std::max(s[d], 0) + 1;
    for (int32_t d = 0; d < g.dims && d < 3; ++d) {
        if (c[d] == nullptr) continue;
        if (curvilinear) {
            const auto [lo, hi] = std::minmax_element(c[d], c[d] + nodes);
            Value& e = v.add(kNames[d], Value::object());
            e.add("minimum", *lo);
            e.add("maximum", *hi);
        } else {
            Value& b = v.add(kNames[d], Value::array());
            for (int32_t i = 0; i <= std::max(s[d], 0); ++i) b.push(c[d][i]);
        }
    }
    return v;
}

// What the file keeps of an item's values: its extremes and delete count,
// and with per-element statistics the mean over all values.
Value storedStatistics(HeaderHandle h, int32_t n, ItemHandle item) {
    Value v = Value::object();
    v.add("type", grdGetItemStatsType(h));
    const double none = grdGetDeleteValDouble(h);
    double minimum = none, maximum = none;
    int32_t deletes = 0;
    grdGetItemStatsGlobal(item, &minimum, &maximum, &deletes);
    const bool known = minimum != none && maximum != none;
    // Extremes of a float item are floats: shown as such.
    const bool single = itemInfo(item).dataType == RCF_FLOAT;
    const auto extreme = [&](double d) {
        return !known ? Value(nullptr) : single ? floatValue(static_cast<float>(d)) : Value(d);
    };
    v.add("minimum", extreme(minimum));
    v.add("maximum", extreme(maximum));
    v.add("deletes", deletes);
    const int32_t type = grdGetItemStatsType(h);
    if (type == F_ITEM_STATS_ELEMENT || type == F_ITEM_STATS_ELEMENT_ALT) {
        const double mean = storedMean(h, n);
        v.add("mean", std::isfinite(mean) ? Value(mean) : Value(nullptr));
    }
    return v;
}

// Whether the data end where the header's time steps do: a jump to the
// position after the last counted step (no reading of the steps), compared
// with the file's size. Any doubt sends the file through the full check.
bool endsWhereHeaderSays(const GridFile& grid, const RecordFileInfo& file) {
    const HeaderHandle h = grid.header();
    const FileHandle f = grid.file();
    // Only the file types with fixed spatial data have time steps of one length.
    const int32_t type = grdGetFileType(h);
    if (type != F_EQTIME_FIXEDSPACE_ALLITEMS && type != F_NEQTIME_FIXEDSPACE_ALLITEMS) return true;
    const int32_t steps = timeAxis(h).timeSteps;
    if (grdFindTimeStep(h, f, steps) != F_NO_ERROR) return false;
    return rcfPeekError(f) == F_NO_ERROR && rcfTell64(f) == static_cast<int64_t>(file.size);
}

}  // namespace

Value describeGrid(const RecordFileInfo& file, Diagnosis* diagnosis) {
    const GridFile grid(file.path);
    const HeaderHandle h = grid.header();

    Value grd = Value::object();
    const int32_t fileType = grdGetFileType(h);
    grd.add("fileType", fileType);
    grd.add("fileTypeName", grdFileTypeStr(fileType));
    grd.add("fileTitle", grdGetFileTitle(h));
    grd.add("application", grdGetAppTitle(h));
    grd.add("applicationVersion", grdGetAppVersionNo(h));
    grd.add("dataType", grdGetDataType(h));
    grd.add("statisticsType", grdGetItemStatsType(h));
    grd.add("compressed", grdIsFileCompressed(h) != 0);
    if (grdIsFileCompressed(h) != 0) grd.add("keyLength", grdGetEncodeKeySize(h));
    grd.add("deleteValues", deleteValues(h));
    grd.add("projection", projection(h));
    grd.add("timeAxis", timeAxisValue(h));
    grd.add("items", items(h));
    std::string failure;
    grd.add("staticItems", staticItems(grid, &failure));
    grd.add("customBlocks", customBlocks(h));
    if (!failure.empty()) grd.add("error", file.path + ": " + failure);
    if (!failure.empty() || !endsWhereHeaderSays(grid, file)) *diagnosis = diagnose(file.path);
    return grd;
}

Value describeItem(const RecordFileInfo& file, const std::string& key) {
    const GridFile grid(file.path);
    const HeaderHandle h = grid.header();
    const int32_t n = findByName(itemNames(h), key, "item", file.path);
    const ItemHandle item = grdItemD(h, n);
    Value doc = Value::object();
    doc.add("file", file.path);
    doc.add("item", n);
    addItemColumns(doc, item);
    addStorage(doc, item);
    doc.add("coordinates", axisCoordinates(itemGeometry(item), item));

    const TimeAxis axis = timeAxis(h);
    Value& time = doc.add("time", Value::object());
    time.add("steps", axis.timeSteps);
    if (axis.timeSteps > 0 && axis.type >= F_TM_EQ_AXIS && axis.type <= F_CAL_NEQ_AXIS) {
        time.add("first", axis.text(0));
        time.add("last", axis.text(axis.lastOffset()));
    }
    doc.add("statistics", storedStatistics(h, n, item));
    return doc;
}

}  // namespace tova_cli
