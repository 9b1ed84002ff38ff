// Plain-text rendering of report values (see text.h).
#include "text.h"

#include <algorithm>
#include <cstdio>
#include <vector>

namespace tova_cli {

std::string printable(std::string_view s) {
    std::string out;
    out.reserve(s.size());
    appendEscaped(out, s, [](std::string& o, unsigned char c) {
        if (c < 0x20 || c >= 0x7F) {
            char buffer[8];
            std::snprintf(buffer, sizeof(buffer), "\\x%02x", c);
            o += buffer;
        } else {
            o += static_cast<char>(c);
        }
    });
    return out;
}

size_t displayWidth(std::string_view s) {
    return static_cast<size_t>(
        std::count_if(s.begin(), s.end(), [](char c) { return (static_cast<unsigned char>(c) & 0xC0) != 0x80; }));
}

namespace {

struct ScalarText {
    std::string operator()(std::nullptr_t) const { return "-"; }
    std::string operator()(bool b) const { return b ? "yes" : "no"; }
    std::string operator()(int64_t i) const { return std::to_string(i); }
    std::string operator()(uint64_t u) const { return std::to_string(u); }
    std::string operator()(double d) const { return formatDouble(d); }
    std::string operator()(const std::string& s) const { return printable(s); }
    std::string operator()(const Value::Array& a) const {
        if (a.empty()) return "(none)";
        std::string out;
        for (size_t i = 0; i < a.size(); ++i) {
            if (i != 0) out += ", ";
            out += scalarText(a[i]);
        }
        return out;
    }
    std::string operator()(const Value::Object& o) const {
        std::string out;
        for (size_t i = 0; i < o.size(); ++i) {
            if (i != 0) out += ", ";
            out += o[i].first + "=" + scalarText(o[i].second);
        }
        return out;
    }
};

bool isNumber(const Value& v) {
    return v.visit([](const auto& x) {
        using T = std::decay_t<decltype(x)>;
        return std::is_same_v<T, int64_t> || std::is_same_v<T, uint64_t> || std::is_same_v<T, double>;
    });
}

// An array whose elements are all objects is shown as a table.
bool isTable(const Value& v) {
    if (!v.isArray() || v.elements().empty()) return false;
    return std::all_of(v.elements().begin(), v.elements().end(), [](const Value& e) { return e.isObject(); });
}

void pad(std::string& out, size_t width, size_t used) {
    if (width > used) out.append(width - used, ' ');
}

void padText(std::string& out, size_t width, const std::string& text) { pad(out, width, displayWidth(text)); }

void writeTable(std::string& out, const Value::Array& rows, const std::string& indent) {
    std::vector<std::string> columns;
    for (const Value& row : rows) {
        for (const Value::Member& m : row.members()) {
            if (std::find(columns.begin(), columns.end(), m.first) == columns.end()) columns.push_back(m.first);
        }
    }
    std::vector<std::vector<std::string>> cells(rows.size(), std::vector<std::string>(columns.size(), "-"));
    std::vector<bool> numeric(columns.size(), true);
    std::vector<size_t> width(columns.size());
    for (size_t c = 0; c < columns.size(); ++c) width[c] = columns[c].size();
    for (size_t r = 0; r < rows.size(); ++r) {
        for (size_t c = 0; c < columns.size(); ++c) {
            if (const Value* v = rows[r].find(columns[c])) {
                cells[r][c] = scalarText(*v);
                numeric[c] = numeric[c] && (isNumber(*v) || v->isNull());
            }
            width[c] = std::max(width[c], displayWidth(cells[r][c]));
        }
    }
    const auto line = [&](const std::vector<std::string>& texts) {
        std::string text = indent;
        for (size_t c = 0; c < columns.size(); ++c) {
            const size_t w = c + 1 < columns.size() || numeric[c] ? width[c] : 0;
            if (c != 0) text += "  ";
            if (numeric[c]) padText(text, w, texts[c]);
            text += texts[c];
            if (!numeric[c]) padText(text, w, texts[c]);
        }
        while (!text.empty() && text.back() == ' ') text.pop_back();
        out += text + '\n';
    };
    line(columns);
    for (const auto& row : cells) line(row);
}

void writeObject(std::string& out, const Value::Object& object, const std::string& indent) {
    size_t keyWidth = 0;
    for (const Value::Member& m : object) {
        if (!m.second.isObject() && !isTable(m.second)) keyWidth = std::max(keyWidth, m.first.size());
    }
    for (const Value::Member& m : object) {
        const Value& v = m.second;
        if (v.isObject()) {
            out += indent + printable(m.first) + ":\n";
            writeObject(out, v.members(), indent + "  ");
        } else if (isTable(v)) {
            out += indent + printable(m.first) + ":\n";
            writeTable(out, v.elements(), indent + "  ");
        } else {
            std::string text = indent + printable(m.first);
            padText(text, indent.size() + keyWidth + 2, text);
            out += text + scalarText(v) + '\n';
        }
    }
}

}  // namespace

std::string scalarText(const Value& value) { return value.visit(ScalarText{}); }

std::string toText(const Value& value) {
    std::string out;
    if (value.isObject()) {
        writeObject(out, value.members(), "");
    } else if (isTable(value)) {
        writeTable(out, value.elements(), "");
    } else {
        out = scalarText(value) + '\n';
    }
    return out;
}

}  // namespace tova_cli
