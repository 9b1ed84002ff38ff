// Unit library, look-ups: units and quantity types by key (binary search over
// the sorted tables) and by text.
#include <algorithm>
#include <cctype>
#include <iterator>
#include <string_view>

#include "qty/qty_internal.h"
#include "qty/qty_tables.h"

namespace qty {

namespace {

template <class T, size_t N>
const T* findByKey(const T (&table)[N], int32_t key) noexcept {
    const T* it = std::lower_bound(std::begin(table), std::end(table), key,
                                   [](const T& entry, int32_t k) { return entry.key < k; });
    return it != std::end(table) && it->key == key ? it : nullptr;
}

std::string_view trimmed(const char* text) noexcept {
    std::string_view s(text);
    const auto blank = [](char c) { return std::isspace(static_cast<unsigned char>(c)) != 0; };
    while (!s.empty() && blank(s.front())) s.remove_prefix(1);
    while (!s.empty() && blank(s.back())) s.remove_suffix(1);
    return s;
}

bool equalIgnoringCase(std::string_view a, std::string_view b) noexcept {
    return a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin(), [](char x, char y) {
               return std::tolower(static_cast<unsigned char>(x)) == std::tolower(static_cast<unsigned char>(y));
           });
}

}  // namespace

const Unit* findUnit(int32_t key) noexcept { return findByKey(kUnits, key); }

const Quantity* findQuantity(int32_t key) noexcept { return findByKey(kQuantities, key); }

const Unit* findUnitByText(const char* text) noexcept {
    if (text == nullptr) return nullptr;
    const std::string_view s = trimmed(text);
    for (const Unit& u : kUnits)
        if (s == u.text) return &u;
    for (const Alias& a : kUnitAliases)
        if (s == a.text) return findUnit(a.unit);
    return nullptr;
}

const Quantity* findQuantityByText(const char* text) noexcept {
    if (text == nullptr) return nullptr;
    const std::string_view s = trimmed(text);
    const Quantity* folded = nullptr;
    int foldedMatches = 0;
    for (const Quantity& q : kQuantities) {
        if (s == q.text) return &q;
        if (equalIgnoringCase(s, q.text)) {
            folded = &q;
            ++foldedMatches;
        }
    }
    return foldedMatches == 1 ? folded : nullptr;
}

bool unitFitsQuantity(const Quantity& q, const Unit& u) noexcept {
    return q.key == QTY_ITEM_UNDEFINED || u.dim == q.dim;
}

}  // namespace qty
