// The report value and its JSON form: string escaping that keeps any byte
// sequence valid JSON, shortest round-trip numbers, two-space indentation.
#include "json.h"

#include <charconv>
#include <cmath>
#include <cstdio>

namespace tova_cli {

Value& Value::add(std::string key, Value value) {
    if (isNull()) v_ = Object{};
    Object& object = std::get<Object>(v_);
    object.emplace_back(std::move(key), std::move(value));
    return object.back().second;
}

Value& Value::push(Value value) {
    if (isNull()) v_ = Array{};
    Array& array = std::get<Array>(v_);
    array.push_back(std::move(value));
    return array.back();
}

const Value* Value::find(std::string_view key) const {
    if (!isObject()) return nullptr;
    for (const Member& m : members()) {
        if (m.first == key) return &m.second;
    }
    return nullptr;
}

std::string formatDouble(double d) {
    if (std::isnan(d)) return "nan";
    if (std::isinf(d)) return d < 0 ? "-inf" : "inf";
    char buffer[64];
    const auto result = std::to_chars(buffer, buffer + sizeof(buffer), d);
    return std::string(buffer, result.ptr);
}

size_t utf8Length(std::string_view s, size_t i) {
    const auto byte = [&](size_t k) { return static_cast<unsigned char>(s[k]); };
    const unsigned char lead = byte(i);
    size_t n = 0;
    unsigned char low = 0x80;
    unsigned char high = 0xBF;
    if (lead >= 0xC2 && lead <= 0xDF) {
        n = 2;
    } else if (lead >= 0xE0 && lead <= 0xEF) {
        n = 3;
        if (lead == 0xE0) low = 0xA0;   // overlong
        if (lead == 0xED) high = 0x9F;  // surrogates
    } else if (lead >= 0xF0 && lead <= 0xF4) {
        n = 4;
        if (lead == 0xF0) low = 0x90;   // overlong
        if (lead == 0xF4) high = 0x8F;  // beyond U+10FFFF
    } else {
        return 0;
    }
    if (i + n > s.size()) return 0;
    if (byte(i + 1) < low || byte(i + 1) > high) return 0;
    for (size_t k = 2; k < n; ++k) {
        if (byte(i + k) < 0x80 || byte(i + k) > 0xBF) return 0;
    }
    return n;
}

namespace {

void appendEscape(std::string& out, unsigned code) {
    char buffer[8];
    std::snprintf(buffer, sizeof(buffer), "\\u%04x", code);
    out += buffer;
}

void indentTo(std::string& out, int level) { out.append(static_cast<size_t>(level) * 2, ' '); }

void write(std::string& out, const Value& value, int level);

struct Writer {
    std::string& out;
    int level;

    void operator()(std::nullptr_t) const { out += "null"; }
    void operator()(bool b) const { out += b ? "true" : "false"; }
    void operator()(int64_t i) const { out += std::to_string(i); }
    void operator()(uint64_t u) const { out += std::to_string(u); }
    void operator()(double d) const { out += std::isfinite(d) ? formatDouble(d) : "null"; }
    void operator()(const std::string& s) const { appendJsonString(out, s); }

    void operator()(const Value::Array& array) const {
        if (array.empty()) {
            out += "[]";
            return;
        }
        // Arrays of plain values stay on one line.
        bool flat = true;
        for (const Value& v : array) flat = flat && v.isScalar();
        out += '[';
        for (size_t i = 0; i < array.size(); ++i) {
            if (i != 0) out += flat ? ", " : ",";
            if (!flat) {
                out += '\n';
                indentTo(out, level + 1);
            }
            write(out, array[i], level + 1);
        }
        if (!flat) {
            out += '\n';
            indentTo(out, level);
        }
        out += ']';
    }

    void operator()(const Value::Object& object) const {
        if (object.empty()) {
            out += "{}";
            return;
        }
        out += '{';
        for (size_t i = 0; i < object.size(); ++i) {
            if (i != 0) out += ',';
            out += '\n';
            indentTo(out, level + 1);
            appendJsonString(out, object[i].first);
            out += ": ";
            write(out, object[i].second, level + 1);
        }
        out += '\n';
        indentTo(out, level);
        out += '}';
    }
};

void write(std::string& out, const Value& value, int level) { value.visit(Writer{out, level}); }

}  // namespace

void appendJsonString(std::string& out, std::string_view s) {
    out += '"';
    appendEscaped(out, s, [](std::string& o, unsigned char c) {
        switch (c) {
        case '"': o += "\\\""; break;
        case '\\': o += "\\\\"; break;
        case '\b': o += "\\b"; break;
        case '\f': o += "\\f"; break;
        case '\n': o += "\\n"; break;
        case '\r': o += "\\r"; break;
        case '\t': o += "\\t"; break;
        default:
            if (c < 0x20 || c >= 0x80) {
                appendEscape(o, c);  // a control character, or a Latin-1 byte
            } else {
                o += static_cast<char>(c);
            }
        }
    });
    out += '"';
}

std::string toJson(const Value& value) {
    std::string out;
    write(out, value, 0);
    out += '\n';
    return out;
}

}  // namespace tova_cli
