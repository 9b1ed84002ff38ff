// The document model of the tool's reports: a JSON-shaped value (null, bool,
// integer, double, text, array, object with keys in insertion order). Commands
// build one Value and print it either as JSON (writeJson) or as aligned text
// (writeText in text.h), so both forms always say the same.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

namespace tova_cli {

class Value {
public:
    using Array = std::vector<Value>;
    using Member = std::pair<std::string, Value>;
    using Object = std::vector<Member>;

    Value() = default;
    Value(std::nullptr_t) {}
    Value(bool b) : v_(b) {}
    template <class I, std::enable_if_t<std::is_integral_v<I> && !std::is_same_v<I, bool>, int> = 0>
    Value(I i) {
        if constexpr (std::is_unsigned_v<I> && sizeof(I) >= sizeof(int64_t)) {
            v_ = static_cast<uint64_t>(i);
        } else {
            v_ = static_cast<int64_t>(i);
        }
    }
    Value(double d) : v_(d) {}
    Value(std::string s) : v_(std::move(s)) {}
    Value(std::string_view s) : v_(std::string(s)) {}
    Value(const char* s) : v_(std::string(s != nullptr ? s : "")) {}
    Value(Array a) : v_(std::move(a)) {}
    Value(Object o) : v_(std::move(o)) {}

    static Value array() { return Value(Array{}); }
    static Value object() { return Value(Object{}); }

    // Appends a member to an object (or an element to an array) and returns
    // a reference to the value added. Null turns into the container first.
    Value& add(std::string key, Value value);
    Value& push(Value value);

    // Member of an object by key; null when absent or not an object.
    const Value* find(std::string_view key) const;

    bool isNull() const { return std::holds_alternative<std::nullptr_t>(v_); }
    bool isObject() const { return std::holds_alternative<Object>(v_); }
    bool isArray() const { return std::holds_alternative<Array>(v_); }
    bool isScalar() const { return !isObject() && !isArray(); }
    const Object& members() const { return std::get<Object>(v_); }
    const Array& elements() const { return std::get<Array>(v_); }
    const std::string* text() const { return std::get_if<std::string>(&v_); }

    template <class F>
    decltype(auto) visit(F&& f) const {
        return std::visit(std::forward<F>(f), v_);
    }

private:
    std::variant<std::nullptr_t, bool, int64_t, uint64_t, double, std::string, Array, Object> v_;
};

// Shortest decimal text that reads back to the same double ("nan", "inf" and
// "-inf" for the values JSON cannot hold).
std::string formatDouble(double d);

// Length of the valid UTF-8 sequence of two to four bytes that starts at
// s[i], or 0 (also for plain ASCII).
size_t utf8Length(std::string_view s, size_t i);

// Appends s to out: valid multi-byte UTF-8 sequences as they are, every other
// byte through escape(out, byte).
template <class Escape>
void appendEscaped(std::string& out, std::string_view s, Escape escape) {
    for (size_t i = 0; i < s.size();) {
        if (const size_t n = static_cast<unsigned char>(s[i]) >= 0x80 ? utf8Length(s, i) : 0) {
            out.append(s.substr(i, n));
            i += n;
        } else {
            escape(out, static_cast<unsigned char>(s[i++]));
        }
    }
}

// Appends s as a JSON string literal. Bytes that do not form valid UTF-8 are
// taken as Latin-1 characters, so any byte sequence gives valid JSON.
void appendJsonString(std::string& out, std::string_view s);

// JSON text of a value, indented by two spaces per level, ending in a newline.
// Doubles that are not finite become null.
std::string toJson(const Value& value);

}  // namespace tova_cli
