// The gridded-data part of `tova info`: file type, titles, application, data
// type, statistics type, compression, delete values, projection, the time
// axis with the time of its last step, every item with its quantity, unit and
// axis, the static items and the custom blocks, all read through the
// gridded data-file API.
#include <algorithm>

#include "grd_access.h"
#include "grd_commands.h"
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

Value items(HeaderHandle h) {
    Value rows = Value::array();
    const int32_t n = grdGetNoOfItems(h);
    for (int32_t i = 1; i <= n; ++i) {
        const ItemHandle item = grdItemD(h, i);
        Value& row = rows.push(Value::object());
        row.add("item", i);
        addItemColumns(row, item);
        int32_t keyLength = 0;
        grdIsItemCompressed(item, &keyLength);
        row.add("stored", grdGetUsedItemElements(item));
        row.add("compressed", keyLength > 0);
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

}  // namespace

Value describeGrid(const RecordFileInfo& file) {
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
    return grd;
}

}  // namespace tova_cli
