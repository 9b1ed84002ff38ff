// Unit library, data model: exact rational numbers, physical dimensions, and
// the unit, quantity-type and alias records the tables are made of.
//
// Unit factors are exact rationals so that the tables state definitions
// (1 ft = 3048/10000 m, 1 US gal = 231 in^3) and a conversion factor between
// two units is rounded to double only once.
#pragma once

#include <array>
#include <cstdint>
#include <limits>
#include <numeric>
#include <optional>
#include <span>

namespace qty {

// ---- Exact rationals ------------------------------------------------------

// n/d in lowest terms with d > 0.
struct Rat {
    int64_t n = 0;
    int64_t d = 1;
    friend constexpr bool operator==(const Rat&, const Rat&) = default;
};

// a*b, or false when the product does not fit in 64 bits.
constexpr bool mulFits(int64_t a, int64_t b, int64_t& r) {
    constexpr int64_t kMax = std::numeric_limits<int64_t>::max();
    if (a == 0 || b == 0) {
        r = 0;
        return true;
    }
    const int64_t ua = a < 0 ? -a : a;  // magnitudes stay far from INT64_MIN in the tables
    const int64_t ub = b < 0 ? -b : b;
    if (ua > kMax / ub) return false;
    r = a * b;
    return true;
}

constexpr Rat ratReduced(int64_t n, int64_t d) {
    if (d < 0) {
        n = -n;
        d = -d;
    }
    const int64_t g = std::gcd(n, d);
    return g > 1 ? Rat{n / g, d / g} : Rat{n, d};
}

// Checked arithmetic: nullopt on 64-bit overflow or division by zero.
constexpr std::optional<Rat> ratMul(Rat x, Rat y) {
    const int64_t g1 = std::gcd(x.n, y.d);  // >= 1: denominators are positive
    const int64_t g2 = std::gcd(y.n, x.d);
    int64_t n = 0;
    int64_t d = 0;
    if (!mulFits(x.n / g1, y.n / g2, n) || !mulFits(x.d / g2, y.d / g1, d)) return std::nullopt;
    return ratReduced(n, d);
}

constexpr std::optional<Rat> ratDiv(Rat x, Rat y) {
    if (y.n == 0) return std::nullopt;
    return ratMul(x, ratReduced(y.d, y.n));
}

constexpr std::optional<Rat> ratSub(Rat x, Rat y) {
    const int64_t g = std::gcd(x.d, y.d);
    int64_t a = 0;
    int64_t b = 0;
    int64_t d = 0;
    if (!mulFits(x.n, y.d / g, a) || !mulFits(y.n, x.d / g, b) || !mulFits(x.d, y.d / g, d)) return std::nullopt;
    if ((b < 0 && a > std::numeric_limits<int64_t>::max() + b) || (b > 0 && a < std::numeric_limits<int64_t>::min() + b))
        return std::nullopt;
    return ratReduced(a - b, d);
}

// Unchecked forms for building the tables at compile time: an overflow there
// makes the expression non-constant, so a bad definition does not compile.
constexpr Rat operator*(Rat x, Rat y) { return ratMul(x, y).value(); }
constexpr Rat operator/(Rat x, Rat y) { return ratDiv(x, y).value(); }
constexpr Rat operator-(Rat x, Rat y) { return ratSub(x, y).value(); }
constexpr Rat rat(int64_t n, int64_t d = 1) { return ratReduced(n, d); }

// Nearest double when n and d are below 2^53 (one rounding).
constexpr double ratToDouble(Rat r) { return static_cast<double>(r.n) / static_cast<double>(r.d); }

// ---- Dimensions -------------------------------------------------------------

// Exponents over the SI base dimensions plus plane angle, which is kept as a
// dimension of its own so that radians and degrees convert into each other
// but never into plain numbers. `undefined` marks the undefined unit and
// quantity, whose dimension equals nothing else.
struct Dim {
    enum Base { kL, kM, kT, kI, kTheta, kN, kJ, kA, kCount };
    std::array<int8_t, kCount> e{};
    bool undefined = false;
    friend constexpr bool operator==(const Dim&, const Dim&) = default;
};

constexpr Dim dimBase(Dim::Base b) {
    Dim d;
    d.e[b] = 1;
    return d;
}
constexpr Dim operator*(Dim x, Dim y) {
    for (int i = 0; i < Dim::kCount; ++i) x.e[i] = static_cast<int8_t>(x.e[i] + y.e[i]);
    return x;
}
constexpr Dim operator/(Dim x, Dim y) {
    for (int i = 0; i < Dim::kCount; ++i) x.e[i] = static_cast<int8_t>(x.e[i] - y.e[i]);
    return x;
}

// ---- Table records ----------------------------------------------------------

// A unit: value_SI = value * scale * pi^piPower + offset. The offset (in the
// coherent SI unit) is non-zero only for temperature scales.
struct Unit {
    int32_t key;
    const char* text;  // symbol, ASCII, unique
    const char* description;
    Dim dim;
    Rat scale;
    int8_t piPower;
    Rat offset;
};

// A quantity type: its units in order, the first being its base unit.
struct Quantity {
    int32_t key;
    const char* text;  // e.g. "WaterLevel", unique
    const char* description;
    Dim dim;
    std::span<const int32_t> units;
};

// A further spelling of a unit symbol accepted by text look-ups.
struct Alias {
    const char* text;
    int32_t unit;
};

}  // namespace qty
