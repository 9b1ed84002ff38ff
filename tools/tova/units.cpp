// `tova units [QUERY]`: the quantity types of the unit library with their
// units in sequence order (the first is the default unit), filtered by a
// case-insensitive part of the quantity's text key or description, or by its
// number.
#include <algorithm>
#include <cctype>
#include <cstdio>

#include "qty/qty.h"
#include "text.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

std::string lowered(std::string_view s) {
    std::string out(s);
    std::transform(out.begin(), out.end(), out.begin(), [](unsigned char c) { return std::tolower(c); });
    return out;
}

bool matches(const std::string& query, int32_t key, const char* text, const char* description) {
    if (query.empty() || query == std::to_string(key)) return true;
    const std::string q = lowered(query);
    return lowered(text).find(q) != std::string::npos || lowered(description).find(q) != std::string::npos;
}

Value unitsOf(int32_t itemType) {
    Value units = Value::array();
    const int32_t count = qtyGetItemUnitCount(itemType);
    for (int32_t seq = 1; seq <= count; ++seq) {
        int32_t unit = 0;
        const char* text = "";
        if (!qtyGetItemUnitSeq(itemType, seq, &unit, &text)) continue;
        const char* description = "";
        qtyGetUnitDescription(unit, &description);
        Value& u = units.push(Value::object());
        u.add("key", unit);
        u.add("name", text);
        u.add("description", description);
    }
    return units;
}

std::string textOf(const Value& quantities) {
    std::string out;
    for (const Value& q : quantities.elements()) {
        out += scalarText(*q.find("name")) + " (" + scalarText(*q.find("key")) + ")";
        const std::string description = scalarText(*q.find("description"));
        if (!description.empty()) out += ": " + description;
        out += "\n  ";
        const Value& units = *q.find("units");
        if (units.elements().empty()) out += "(no units)";
        for (size_t i = 0; i < units.elements().size(); ++i) {
            const Value& u = units.elements()[i];
            out += (i != 0 ? ", " : "") + scalarText(*u.find("name")) + " (" + scalarText(*u.find("key")) + ")";
        }
        out += '\n';
    }
    return out;
}

}  // namespace

int runUnits(const UnitsOptions& options) {
    const std::string query = options.query.value_or("");
    Value quantities = Value::array();
    const int32_t count = qtyGetItemTypeCount();
    for (int32_t i = 0; i < count; ++i) {
        int32_t key = 0;
        const char* text = "";
        const char* description = "";
        if (!qtyGetItemTypeByIndex(i, &key, &text, &description)) continue;
        if (!matches(query, key, text, description)) continue;
        Value& q = quantities.push(Value::object());
        q.add("key", key);
        q.add("name", text);
        q.add("description", description);
        q.add("units", unitsOf(key));
    }
    if (quantities.elements().empty() && !query.empty()) {
        std::fprintf(stderr, "tova units: no quantity matches \"%s\"\n", printable(query).c_str());
        return kExitFailed;
    }
    if (options.json) {
        Value doc = Value::object();
        doc.add("quantities", std::move(quantities));
        printOut(toJson(doc));
    } else {
        printOut(textOf(quantities));
    }
    return kExitOk;
}

}  // namespace tova_cli
