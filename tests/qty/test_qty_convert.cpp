// Unit conversions through the exported interface: known values, refusal
// across dimensions, and the in-place array forms with delete values.
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <numbers>
#include <vector>

#include "qty/qty.h"
#include "qty/qty_tables.h"

using namespace qty;

namespace {

double convert(int32_t from, double v, int32_t to) {
    double out = std::nan("");
    EXPECT_TRUE(qtyConvertUnit(from, v, to, &out)) << from << " -> " << to;
    return out;
}

// Within n units in the last place of the expected value.
::testing::AssertionResult ulpsNear(double got, double want, int n = 1) {
    const double tol = n * std::fabs(want) * std::numeric_limits<double>::epsilon();
    if (std::fabs(got - want) <= tol) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << got << " is not within " << n << " ulp of " << want;
}

constexpr double kDelD = -1e-255;
constexpr float kDelF = -1e-35f;

}  // namespace

TEST(QtyConvert, LengthAreaVolumeAndFlowFollowTheExactDefinitions) {
    EXPECT_EQ(convert(kFoot, 1, kMetre), 0.3048);
    EXPECT_TRUE(ulpsNear(convert(kMetre, 1, kFoot), 1 / 0.3048));
    EXPECT_TRUE(ulpsNear(convert(kMetre, 0.3048, kFoot), 1.0));
    EXPECT_EQ(convert(kFoot, 1, kInch), 12.0);
    EXPECT_EQ(convert(kMile, 1, kFoot), 5280.0);
    EXPECT_EQ(convert(kInch, 1, kMillimetre), 25.4);
    EXPECT_EQ(convert(kNauticalMile, 1, kMetre), 1852.0);
    EXPECT_EQ(convert(kFootUs, 3937, kMetre), 1200.0);
    EXPECT_EQ(convert(kAcre, 1, kSquareMetre), 4046.8564224);
    EXPECT_EQ(convert(kHectare, 1, kSquareMetre), 10000.0);
    EXPECT_EQ(convert(kGallonUs, 1, kLitre), 3.785411784);
    EXPECT_EQ(convert(kCubicFootPerSecond, 1, kCubicMetrePerSecond), 0.028316846592);
    EXPECT_TRUE(ulpsNear(convert(kCubicMetrePerSecond, 1, kCubicFootPerSecond), 1 / 0.028316846592));
    EXPECT_TRUE(ulpsNear(convert(kCubicFootPerSecond, 231, kGallonUsPerMinute), 1728.0 * 60));
}

TEST(QtyConvert, SpeedsTimesAndPressures) {
    EXPECT_EQ(convert(kKnot, 1, kKilometrePerHour), 1.852);
    EXPECT_TRUE(ulpsNear(convert(kKilometrePerHour, 1.852, kKnot), 1.0));
    EXPECT_EQ(convert(kKilometrePerHour, 36, kMetrePerSecond), 10.0);
    EXPECT_EQ(convert(kMilePerHour, 1, kKilometrePerHour), 1.609344);
    EXPECT_EQ(convert(kMillimetrePerDay, 86.4, kMillimetrePerHour), 3.6);
    EXPECT_EQ(convert(kWeek, 1, kHour), 168.0);
    EXPECT_EQ(convert(kDay, 1, QTY_UNIT_SECOND), 86400.0);
    EXPECT_EQ(convert(kAtmosphere, 1, kHectopascal), 1013.25);
    EXPECT_EQ(convert(kMetreOfWater, 1, kPascal), 9806.65);
    EXPECT_TRUE(ulpsNear(convert(kPoundPerSquareInch, 1, kPascal), 6894.757293168361));
    EXPECT_EQ(convert(kMilligramPerLitre, 5, kGramPerCubicMetre), 5.0);
    EXPECT_EQ(convert(kMilligramPerLitre, 1000, kKilogramPerCubicMetre), 1.0);
    EXPECT_EQ(convert(kPartPerMillion, 10000, kPercent), 1.0);
}

TEST(QtyConvert, TemperatureScalesUseTheirOffsets) {
    EXPECT_EQ(convert(kDegreeCelsius, 100, kDegreeFahrenheit), 212.0);
    EXPECT_EQ(convert(kDegreeCelsius, -40, kDegreeFahrenheit), -40.0);
    EXPECT_EQ(convert(kDegreeFahrenheit, 32, kDegreeCelsius), 0.0);
    EXPECT_EQ(convert(kDegreeCelsius, 0, kKelvin), 273.15);
    EXPECT_EQ(convert(kKelvin, 0, kDegreeCelsius), -273.15);
    EXPECT_TRUE(ulpsNear(convert(kDegreeFahrenheit, 32, kKelvin), 273.15));
    EXPECT_TRUE(ulpsNear(convert(kKelvin, 0, kDegreeFahrenheit), -459.67));
}

TEST(QtyConvert, AnglesConvertButNeverIntoPlainNumbers) {
    EXPECT_TRUE(ulpsNear(convert(kDegree, 180, kRadian), std::numbers::pi));
    EXPECT_TRUE(ulpsNear(convert(kRadian, std::numbers::pi / 2, kDegree), 90.0));
    EXPECT_TRUE(ulpsNear(convert(kGon, 100, kDegree), 90.0));
    EXPECT_TRUE(ulpsNear(convert(kRevolutionPerMinute, 60, kRadianPerSecond), 2 * std::numbers::pi));
    double out = 7;
    EXPECT_FALSE(qtyConvertUnit(kRadian, 1, kUnitless, &out));
    EXPECT_FALSE(qtyConvertUnit(kHertz, 1, kRadianPerSecond, &out));
    EXPECT_EQ(out, 7);
}

TEST(QtyConvert, DifferentDimensionsAndUnknownUnitsAreRefused) {
    double out = 7;
    EXPECT_FALSE(qtyConvertUnit(kMetre, 1, QTY_UNIT_SECOND, &out));
    EXPECT_FALSE(qtyConvertUnit(kDegreeCelsius, 1, kMetre, &out));
    EXPECT_FALSE(qtyConvertUnit(kMilligramPerLitre, 1, kPartPerMillion, &out));
    EXPECT_FALSE(qtyConvertUnit(kMetrePerSecond, 1, kSquareMetrePerSecond, &out));
    EXPECT_FALSE(qtyConvertUnit(QTY_UNIT_UNDEFINED, 1, kMetre, &out));
    EXPECT_FALSE(qtyConvertUnit(kMetre, 1, QTY_UNIT_UNDEFINED, &out));
    EXPECT_FALSE(qtyConvertUnit(123456, 1, kMetre, &out));
    EXPECT_FALSE(qtyConvertUnit(kMetre, 1, kFoot, nullptr));
    EXPECT_EQ(out, 7);
    // The undefined unit converts to itself only.
    EXPECT_TRUE(qtyConvertUnit(QTY_UNIT_UNDEFINED, 2.5, QTY_UNIT_UNDEFINED, &out));
    EXPECT_EQ(out, 2.5);

    std::vector<double> d{1, 2, 3};
    std::vector<float> f{1, 2, 3};
    EXPECT_FALSE(qtyConvertItemArrayD(kMetre, kKelvin, d.data(), 3, kDelD));
    EXPECT_FALSE(qtyConvertItemArrayF(kMetre, 99999, f.data(), 3, kDelF));
    EXPECT_FALSE(qtyConvertItemArrayD(kMetre, kFoot, d.data(), -1, kDelD));
    EXPECT_FALSE(qtyConvertItemArrayF(kMetre, kFoot, nullptr, 3, kDelF));
    EXPECT_TRUE(qtyConvertItemArrayD(kMetre, kFoot, nullptr, 0, kDelD));
    EXPECT_EQ(d, (std::vector<double>{1, 2, 3}));
    EXPECT_EQ(f, (std::vector<float>{1, 2, 3}));
}

// Arrays long enough for the blocked loop and its tail, with delete values
// scattered through both; each element must match the scalar conversion.
TEST(QtyConvert, ArraysKeepDeleteValuesAndMatchTheScalarConversion) {
    for (auto [from, to] : {std::pair{kMetre, kFoot}, std::pair{kDegreeCelsius, kDegreeFahrenheit},
                            std::pair{kMetre, kMetre}}) {
        SCOPED_TRACE(to);
        std::vector<double> d(53);
        std::vector<float> f(53);
        for (size_t i = 0; i < d.size(); ++i) {
            d[i] = i % 7 == 3 ? kDelD : 0.37 * static_cast<double>(i) - 4.0;
            f[i] = i % 5 == 1 ? kDelF : static_cast<float>(d[i] == kDelD ? 1.5 : d[i]);
        }
        const std::vector<double> d0 = d;
        const std::vector<float> f0 = f;
        ASSERT_TRUE(qtyConvertItemArrayD(from, to, d.data(), static_cast<int32_t>(d.size()), kDelD));
        ASSERT_TRUE(qtyConvertItemArrayF(from, to, f.data(), static_cast<int32_t>(f.size()), kDelF));
        for (size_t i = 0; i < d.size(); ++i) {
            if (d0[i] == kDelD)
                EXPECT_EQ(d[i], kDelD);
            else
                EXPECT_EQ(d[i], convert(from, d0[i], to)) << i;
            if (f0[i] == kDelF)
                EXPECT_EQ(f[i], kDelF);
            else
                EXPECT_EQ(f[i], static_cast<float>(convert(from, f0[i], to))) << i;
        }
    }
}
