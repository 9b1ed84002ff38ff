// Unit library, conversion: the affine map between two units computed from
// their exact definitions, the in-place array kernels, and the user unit of
// each quantity type.
//
// The kernels are one multiply (and add) per element with a select for the
// delete value, written so that the compiler vectorises them.
#include <array>
#include <atomic>
#include <cstddef>
#include <numbers>

#include "qty/qty_internal.h"
#include "qty/qty_tables.h"

namespace qty {

namespace {

// r * pi^p in double.
double withPi(Rat r, int p) noexcept {
    double n = static_cast<double>(r.n);
    double d = static_cast<double>(r.d);
    for (; p > 0; --p) n *= std::numbers::pi;
    for (; p < 0; ++p) d *= std::numbers::pi;
    return n / d;
}

}  // namespace

bool affineBetween(const Unit& from, const Unit& to, Affine& map, bool* exact) noexcept {
    if (!(from.dim == to.dim)) return false;
    // to = (from_value * sF * pi^pF + oF - oT) / (sT * pi^pT)
    const std::optional<Rat> scale = ratDiv(from.scale, to.scale);
    const std::optional<Rat> shift = ratSub(from.offset, to.offset);
    const std::optional<Rat> offset = shift ? ratDiv(*shift, to.scale) : std::nullopt;
    const bool fromRatios = scale && offset;
    if (fromRatios) {
        map.scale = withPi(*scale, from.piPower - to.piPower);
        map.offset = withPi(*offset, -to.piPower);
    } else {  // unreachable with the shipped tables (a test checks every pair)
        const double sT = withPi(to.scale, to.piPower);
        map.scale = withPi(from.scale, from.piPower) / sT;
        map.offset = (ratToDouble(from.offset) - ratToDouble(to.offset)) / sT;
    }
    if (exact != nullptr) *exact = fromRatios;
    return true;
}

namespace {

// y = x * a (+ b) for one element, keeping the delete value.
template <class T, bool kOffset>
inline T convertOne(T x, T deleteValue, double a, double b) noexcept {
    const double y = kOffset ? static_cast<double>(x) * a + b : static_cast<double>(x) * a;
    return x == deleteValue ? x : static_cast<T>(y);
}

// Blocks of a fixed length let the compiler vectorise the body at -O2 (its
// cheapest cost model wants a known trip count); the rest runs element-wise.
template <class T, bool kOffset>
void convertLoop(T* __restrict values, size_t n, T deleteValue, double a, double b) noexcept {
    constexpr size_t kBlock = 16;
    size_t i = 0;
    for (; i + kBlock <= n; i += kBlock) {
        T* block = values + i;
        for (size_t k = 0; k < kBlock; ++k) block[k] = convertOne<T, kOffset>(block[k], deleteValue, a, b);
    }
    for (; i < n; ++i) values[i] = convertOne<T, kOffset>(values[i], deleteValue, a, b);
}

// The linear case carries no add, which also keeps the sign of zero.
template <class T>
void convertKernel(T* values, int32_t count, T deleteValue, const Affine& m) noexcept {
    if ((m.scale == 1.0 && m.offset == 0.0) || count <= 0) return;
    const size_t n = static_cast<size_t>(count);
    if (m.offset == 0.0)
        convertLoop<T, false>(values, n, deleteValue, m.scale, 0.0);
    else
        convertLoop<T, true>(values, n, deleteValue, m.scale, m.offset);
}

// Index + 1 into kUnits of each quantity's user unit; 0 means the default.
// Relaxed atomics suffice: each slot is one self-contained value and the
// tables it points into never change.
std::array<std::atomic<int32_t>, kQuantityCount> g_userUnits{};

size_t quantityIndex(const Quantity& q) noexcept { return static_cast<size_t>(&q - kQuantities); }

}  // namespace

void convertArray(double* values, int32_t count, double deleteValue, const Affine& m) noexcept {
    convertKernel(values, count, deleteValue, m);
}

void convertArray(float* values, int32_t count, float deleteValue, const Affine& m) noexcept {
    convertKernel(values, count, deleteValue, m);
}

const Unit& userUnit(const Quantity& q) noexcept {
    const int32_t slot = g_userUnits[quantityIndex(q)].load(std::memory_order_relaxed);
    if (slot > 0) return kUnits[slot - 1];
    return *findUnit(q.units.front());  // every sequence unit exists (tested)
}

void setUserUnit(const Quantity& q, const Unit& u) noexcept {
    g_userUnits[quantityIndex(q)].store(static_cast<int32_t>(&u - kUnits) + 1, std::memory_order_relaxed);
}

}  // namespace qty
