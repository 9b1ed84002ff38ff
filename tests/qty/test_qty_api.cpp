// Look-ups, enumeration and user units through the exported interface,
// including user units changed while other threads convert.
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "qty/qty.h"
#include "qty/qty_tables.h"

using namespace qty;

namespace {

int32_t quantityKey(const char* text) {
    int32_t key = -1;
    EXPECT_TRUE(qtyGetItemTypeTag(text, &key)) << text;
    return key;
}

// User units are process-wide: every test starts and ends with the defaults.
class QtyUserUnits : public testing::Test {
protected:
    static void resetAll() {
        for (const Quantity& q : kQuantities) ASSERT_TRUE(qtySetUserUnit(q.key, q.units.front()));
    }
    void SetUp() override { resetAll(); }
    void TearDown() override { resetAll(); }
};

}  // namespace

TEST(QtyApi, TextLookupsAndUnitValidity) {
    const char* text = nullptr;
    int32_t key = 0;
    ASSERT_TRUE(qtyGetUnitKey(kCubicFootPerSecond, &text));
    EXPECT_STREQ(text, "ft^3/s");
    EXPECT_TRUE(qtyGetUnitTag("km/h", &key));
    EXPECT_EQ(key, kKilometrePerHour);
    EXPECT_TRUE(qtyGetUnitTag(" sec ", &key));  // listed spelling, blanks ignored
    EXPECT_EQ(key, QTY_UNIT_SECOND);
    key = 77;
    EXPECT_FALSE(qtyGetUnitTag("MHz", &key));  // no case folding on symbols
    EXPECT_FALSE(qtyGetUnitTag(nullptr, &key));
    EXPECT_EQ(key, 77);

    const int32_t level = quantityKey("WaterLevel");
    EXPECT_EQ(quantityKey("waterlevel"), level);
    EXPECT_FALSE(qtyGetItemTypeTag("NoSuchQuantity", &key));
    ASSERT_TRUE(qtyGetItemTypeKey(level, &text));
    EXPECT_STREQ(text, "WaterLevel");
    ASSERT_TRUE(qtyGetItemTypeDescription(level, &text));
    EXPECT_NE(std::strlen(text), 0u);
    ASSERT_TRUE(qtyGetUnitDescription(kKnot, &text));
    EXPECT_NE(std::string(text).find("knot"), std::string::npos);
    text = "kept";
    EXPECT_FALSE(qtyGetItemTypeKey(0, &text));
    EXPECT_FALSE(qtyGetUnitKey(-1, &text));
    EXPECT_STREQ(text, "kept");

    EXPECT_TRUE(qtyItemUnitEqv(level, kFoot));
    EXPECT_FALSE(qtyItemUnitEqv(level, kDegreeCelsius));
    EXPECT_FALSE(qtyItemUnitEqv(level, QTY_UNIT_UNDEFINED));
    EXPECT_TRUE(qtyItemUnitEqv(QTY_ITEM_UNDEFINED, QTY_UNIT_UNDEFINED));
    EXPECT_TRUE(qtyItemUnitEqv(QTY_ITEM_UNDEFINED, kDegreeCelsius));
    EXPECT_FALSE(qtyItemUnitEqv(QTY_ITEM_UNDEFINED, 123456));
    EXPECT_FALSE(qtyItemUnitEqv(123456, kMetre));
}

TEST(QtyApi, UnitSequencesAndEnumeration) {
    int32_t unit = 0;
    const char* text = nullptr;
    ASSERT_TRUE(qtyGetItemUnitSeq(QTY_ITEM_GEOMETRY_2D, 1, &unit, &text));
    EXPECT_EQ(unit, kMetre);
    EXPECT_STREQ(text, "m");
    ASSERT_TRUE(qtyGetItemUnitSeq(QTY_ITEM_UNDEFINED, 1, &unit, nullptr));
    EXPECT_EQ(unit, QTY_UNIT_UNDEFINED);
    const int32_t n = qtyGetItemUnitCount(QTY_ITEM_GEOMETRY_2D);
    EXPECT_GT(n, 5);
    EXPECT_TRUE(qtyGetItemUnitSeq(QTY_ITEM_GEOMETRY_2D, n, &unit, nullptr));
    unit = 5;
    EXPECT_FALSE(qtyGetItemUnitSeq(QTY_ITEM_GEOMETRY_2D, n + 1, &unit, nullptr));
    EXPECT_FALSE(qtyGetItemUnitSeq(QTY_ITEM_GEOMETRY_2D, 0, &unit, nullptr));
    EXPECT_FALSE(qtyGetItemUnitSeq(123456, 1, &unit, nullptr));
    EXPECT_EQ(unit, 5);
    EXPECT_EQ(qtyGetItemUnitCount(123456), 0);

    // Enumeration reaches every entry, and each answers its own key look-up.
    ASSERT_EQ(qtyGetItemTypeCount(), kQuantityCount);
    for (int32_t i = 0; i < qtyGetItemTypeCount(); ++i) {
        int32_t key = 0;
        const char* description = nullptr;
        ASSERT_TRUE(qtyGetItemTypeByIndex(i, &key, &text, &description));
        int32_t back = 0;
        EXPECT_TRUE(qtyGetItemTypeTag(text, &back));
        EXPECT_EQ(back, key);
    }
    ASSERT_EQ(qtyGetUnitCount(), kUnitCount);
    for (int32_t i = 0; i < qtyGetUnitCount(); ++i) {
        int32_t key = 0;
        ASSERT_TRUE(qtyGetUnitByIndex(i, &key, &text, nullptr));
        int32_t back = 0;
        EXPECT_TRUE(qtyGetUnitTag(text, &back));
        EXPECT_EQ(back, key);
    }
    EXPECT_FALSE(qtyGetItemTypeByIndex(qtyGetItemTypeCount(), nullptr, nullptr, nullptr));
    EXPECT_FALSE(qtyGetUnitByIndex(-1, nullptr, nullptr, nullptr));
}

TEST_F(QtyUserUnits, ConversionsFollowAChangedUserUnit) {
    const int32_t level = quantityKey("WaterLevel");
    int32_t unit = 0;
    ASSERT_TRUE(qtyGetUserUnit(level, &unit));
    EXPECT_EQ(unit, kMetre);
    double out = 0;
    ASSERT_TRUE(qtyConvertToUserUnit(level, kCentimetre, 250, &out));
    EXPECT_EQ(out, 2.5);

    ASSERT_TRUE(qtySetUserUnit(level, kFoot));
    ASSERT_TRUE(qtyGetUserUnit(level, &unit));
    EXPECT_EQ(unit, kFoot);
    ASSERT_TRUE(qtyConvertToUserUnit(level, kMetre, 0.3048 * 3, &out));
    EXPECT_NEAR(out, 3.0, 1e-15);
    ASSERT_TRUE(qtyConvertFromUserUnit(level, kInch, 2, &out));
    EXPECT_EQ(out, 24.0);

    std::vector<double> d{1, -1e-255, 2};
    std::vector<float> f{1, -1e-35f, 2};
    ASSERT_TRUE(qtyConvertItemArrayFromUserUnitD(level, kMetre, d.data(), 3, -1e-255));
    ASSERT_TRUE(qtyConvertItemArrayToUserUnitF(level, kInch, f.data(), 3, -1e-35f));
    EXPECT_EQ(d, (std::vector<double>{0.3048, -1e-255, 0.6096}));
    EXPECT_EQ(f, (std::vector<float>{1.0f / 12, -1e-35f, 2.0f / 12}));

    // Refusals: a unit of another dimension as user unit or as source; unknown quantity.
    EXPECT_FALSE(qtySetUserUnit(level, kDegreeCelsius));
    EXPECT_FALSE(qtySetUserUnit(123456, kMetre));
    out = 9;
    EXPECT_FALSE(qtyConvertToUserUnit(level, kSecond, 1, &out));
    EXPECT_FALSE(qtyConvertFromUserUnit(123456, kMetre, 1, &out));
    EXPECT_FALSE(qtyConvertItemArrayToUserUnitD(level, kKelvin, d.data(), 3, -1e-255));
    EXPECT_EQ(out, 9);
    EXPECT_EQ(d[0], 0.3048);
    ASSERT_TRUE(qtyGetUserUnit(level, &unit));
    EXPECT_EQ(unit, kFoot);
}

TEST_F(QtyUserUnits, UndefinedQuantityKeepsValuesUntilAUserUnitIsChosen) {
    double out = 0;
    ASSERT_TRUE(qtyConvertToUserUnit(QTY_ITEM_UNDEFINED, kDegreeFahrenheit, 50, &out));
    EXPECT_EQ(out, 50.0);
    ASSERT_TRUE(qtySetUserUnit(QTY_ITEM_UNDEFINED, kDegreeCelsius));
    ASSERT_TRUE(qtyConvertToUserUnit(QTY_ITEM_UNDEFINED, kDegreeFahrenheit, 50, &out));
    EXPECT_EQ(out, 10.0);
    EXPECT_FALSE(qtyConvertToUserUnit(QTY_ITEM_UNDEFINED, kMetre, 50, &out));
}

// Readers convert while a writer switches the user unit: every result is the
// conversion into one of the units set, never a mixture. (Run under TSan too.)
TEST_F(QtyUserUnits, ConcurrentConversionsSeeOneUserUnitAtATime) {
    const int32_t speed = quantityKey("CurrentSpeed");
    const int32_t units[] = {kMetrePerSecond, kKnot, kCentimetrePerSecond};
    std::vector<double> allowed;
    for (int32_t u : units) {
        double v = 0;
        ASSERT_TRUE(qtyConvertUnit(kKilometrePerHour, 3.6, u, &v));
        allowed.push_back(v);
    }
    std::atomic<bool> stop{false};
    std::atomic<int> bad{0};
    std::vector<std::thread> readers;
    for (int t = 0; t < 3; ++t) {
        readers.emplace_back([&] {
            std::vector<double> block(64);
            while (!stop.load()) {
                double v = 0;
                if (!qtyConvertToUserUnit(speed, kKilometrePerHour, 3.6, &v)) ++bad;
                std::fill(block.begin(), block.end(), 3.6);
                if (!qtyConvertItemArrayToUserUnitD(speed, kKilometrePerHour, block.data(), 64, -1e-255)) ++bad;
                if (std::find(allowed.begin(), allowed.end(), v) == allowed.end()) ++bad;
                if (std::find(allowed.begin(), allowed.end(), block[0]) == allowed.end()) ++bad;
                if (std::count(block.begin(), block.end(), block[0]) != 64) ++bad;  // one unit per call
            }
        });
    }
    for (int i = 0; i < 20000; ++i) ASSERT_TRUE(qtySetUserUnit(speed, units[i % 3]));
    stop = true;
    for (std::thread& t : readers) t.join();
    EXPECT_EQ(bad.load(), 0);
}
