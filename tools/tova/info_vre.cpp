// The VRE part of `tova info`: size parameters, symmetry, bodies with their
// names and panel counts, the two scalar items and which of the 23 vector
// items the file holds, each with its quantity and storage unit.
#include <string_view>
#include <vector>

#include "handles.h"
#include "qty/qty.h"
#include "tova/vre.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

constexpr const char* kParamMeaning[VRE_SIZE_PARAMS] = {"N0", "body count", "total panel count",          "N3",
                                                        "N4", "",           "1: items 21 and 22 present", "N7"};

std::string quantityName(int32_t key) {
    const char* text = nullptr;
    return qtyGetItemTypeKey(key, &text) && text != nullptr ? text : "?";
}

std::string unitName(int32_t unit) {
    const char* text = nullptr;
    return qtyGetUnitKey(unit, &text) && text != nullptr ? text : "?";
}

void addUnits(Value& row, int32_t key, int32_t unit) {
    row.add("quantity", quantityName(key));
    row.add("unit", unitName(unit));
    row.add("quantityKey", key);
    row.add("unitKey", unit);
}

// Body names and panel counts, asked for only when the file can hold them
// (a damaged body count must not make this tool allocate without bound).
Value bodies(VreHandle h, int32_t count, uint64_t fileSize) {
    Value rows = Value::array();
    if (count <= 0 || static_cast<uint64_t>(count) * sizeof(int32_t) > fileSize) return rows;
    const auto n = static_cast<size_t>(count);
    std::vector<int32_t> panels(n, 0);
    vreGetBodyPanelCount(h, panels.data());
    std::vector<char> names;
    if (static_cast<uint64_t>(count) * VRE_NAME_LENGTH <= fileSize) {
        names.assign(n * VRE_NAME_LENGTH, '\0');
        if (vreGetBodyNames(h, names.data()) != F_NO_ERROR) names.clear();
    }
    for (size_t i = 0; i < n; ++i) {
        Value& row = rows.push(Value::object());
        row.add("body", i + 1);
        if (names.empty()) {
            row.add("name", nullptr);
        } else {
            const std::string_view field(names.data() + i * VRE_NAME_LENGTH, VRE_NAME_LENGTH);
            row.add("name", field.substr(0, field.find('\0')));
        }
        row.add("panels", panels[i]);
    }
    return rows;
}

}  // namespace

Value describeVre(const RecordFileInfo& file) {
    VreHandle opened = nullptr;
    const int32_t status = vreFileRead(file.path.c_str(), &opened);
    const VrePtr h(opened);
    if (status != F_NO_ERROR || !h) throw Failure(file.path + ": the VRE reader failed: status " + statusText(status));

    Value vre = Value::object();
    vre.add("formatVersion", file.versionCreateApp);
    if (file.versionCreateApp != 100 && file.versionCreateApp != 101) {
        vre.add("note", "format version not read by this library: the values below are defaults");
    }

    Value& params = vre.add("parameters", Value::array());
    for (int32_t i = 0; i < VRE_SIZE_PARAMS; ++i) {
        Value& row = params.push(Value::object());
        row.add("index", i);
        row.add("value", vreGetVectorParam(h.get(), i));
        row.add("meaning", kParamMeaning[i]);
    }

    int32_t first = 0;
    int32_t second = 0;
    vreGetSymmetry(h.get(), &first, &second);
    vre.add("symmetry", Value::Array{first, second});
    vre.add("bodies", bodies(h.get(), vreGetVectorParam(h.get(), 1), file.size));

    Value& scalars = vre.add("scalars", Value::array());
    for (int32_t i = 0; i < VRE_SCALAR_ITEMS; ++i) {
        int32_t key = 0, unit = 0, mode = 0, userUnit = 0;
        vreGetScalarItemUnitInfo(h.get(), i, &key, &unit, &mode, &userUnit);
        Value& row = scalars.push(Value::object());
        row.add("item", i);
        row.add("value", vreGetScalarItem(h.get(), i));
        addUnits(row, key, unit);
    }

    Value& items = vre.add("items", Value::array());
    for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
        int32_t key = 0, unit = 0, mode = 0, userUnit = 0;
        vreGetVectorItemUnitInfo(h.get(), i, &key, &unit, &mode, &userUnit);
        const int32_t size = vreGetVectorSize(h.get(), i);
        Value& row = items.push(Value::object());
        row.add("item", i);
        row.add("present", size > 0);
        row.add("elements", size);
        addUnits(row, key, unit);
    }
    return vre;
}

}  // namespace tova_cli
