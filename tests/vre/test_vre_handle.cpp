// VRE handle in memory: defaults, size parameters and element counts, body
// data, and the unit conversion modes checked against the unit library.
#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <vector>

#include "qty/qty.h"
#include "vre/vre_test.h"

using vretest::create;
using vretest::vectorItem;

namespace {

constexpr std::array<int32_t, VRE_VECTOR_ITEMS> kKeys = {
    100514, 100514, 110030, 100514, 110243, 100514, 100514, 110245, 110246, 100085, 110247, 100515,
    110248, 110248, 110266, 110250, 110258, 110258, 110220, 110220, 110258, 100415, 100144};

// A unit of another dimension than the quantity's.
int32_t foreignUnit(int32_t key) {
    for (int32_t i = 0; i < qtyGetUnitCount(); ++i) {
        int32_t unit = 0;
        const char *text = nullptr, *description = nullptr;
        if (qtyGetUnitByIndex(i, &unit, &text, &description) && !qtyItemUnitEqv(key, unit)) return unit;
    }
    return -1;
}

double convert(int32_t from, double value, int32_t to) {
    double out = 0.0;
    EXPECT_NE(qtyConvertUnit(from, value, to, &out), 0);
    return out;
}

}  // namespace

TEST(VreHandle, DefaultsAndQuietAnswers) {
    auto h = create();
    ASSERT_NE(h, nullptr);
    int32_t s0 = 0, s1 = 0;
    EXPECT_EQ(vreGetSymmetry(h.get(), &s0, &s1), 0);
    EXPECT_EQ(s0, 1);
    EXPECT_EQ(s1, 0);
    EXPECT_EQ(vreGetScalarItem(h.get(), 0), 9.80665);
    EXPECT_EQ(vreGetScalarItem(h.get(), 1), 0.0);
    for (int32_t i = 0; i < VRE_SIZE_PARAMS; ++i) EXPECT_EQ(vreGetVectorParam(h.get(), i), 0) << i;
    for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
        int32_t key = 0, unit = 0, mode = -1, user = 0, status = 0;
        vreGetVectorItemUnitInfo(h.get(), i, &key, &unit, &mode, &user);
        EXPECT_EQ(key, kKeys[static_cast<size_t>(i)]) << i;
        EXPECT_EQ(unit, vretest::unitSeq(key, 1)) << i;
        EXPECT_EQ(user, unit) << i;
        EXPECT_EQ(mode, VRE_CONVERT_NONE) << i;
        vectorItem(h.get(), i, &status);
        EXPECT_EQ(status, VRE_NOT_SET) << i;
    }
    int32_t key = 0;
    vreGetScalarItemUnitInfo(h.get(), 1, &key, nullptr, nullptr, nullptr);
    EXPECT_EQ(key, 100280);

    // Out-of-range indices and null handles are answered quietly.
    double value = 0;
    EXPECT_EQ(vreGetVectorParam(h.get(), 8), -1);
    EXPECT_EQ(vreSetVectorParam(h.get(), 8, 5), 0);
    EXPECT_EQ(vreGetScalarItem(h.get(), 2), VRE_DELETE_VALUE);
    EXPECT_EQ(vreSetScalarItem(h.get(), -1, 1.0), 0);
    EXPECT_EQ(vreGetVectorItem(h.get(), 23, &value), VRE_NOT_SET);
    EXPECT_EQ(vreSetVectorItem(h.get(), 23, &value), F_ERR_MEMORY);
    key = 7;
    EXPECT_EQ(vreGetVectorItemUnitInfo(h.get(), 23, &key, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(key, 7);
    EXPECT_EQ(vreSetVectorItemUnit(h.get(), 23, 0), 0);
    EXPECT_EQ(vreGetVectorParam(nullptr, 0), -1);
    EXPECT_EQ(vreGetScalarItem(nullptr, 0), VRE_DELETE_VALUE);
    EXPECT_EQ(vreSetVectorParam(nullptr, 0, 1), F_ERR_ARGUMENT);
    EXPECT_EQ(vreHandleFree(nullptr), 0);
}

TEST(VreHandle, PanelCountsAndSizeParametersGiveElementCounts) {
    auto h = create();
    EXPECT_EQ(vreSetVectorParam(h.get(), 2, 99), F_ERR_ARGUMENT);
    EXPECT_EQ(vreGetVectorParam(h.get(), 2), 0);
    const int32_t n0 = 2, b = 2, n3 = 3, n4 = 5, n7 = 4;
    vreSetVectorParam(h.get(), 0, n0);
    vreSetVectorParam(h.get(), 1, b);
    vreSetVectorParam(h.get(), 3, n3);
    vreSetVectorParam(h.get(), 4, n4);
    vreSetVectorParam(h.get(), 7, n7);
    // Panel counts are made on first get, zero-filled.
    EXPECT_EQ(vretest::panelCounts(h.get()), (std::vector<int32_t>{0, 0}));
    const int32_t counts[2] = {3, 4};
    ASSERT_EQ(vreSetBodyPanelCount(h.get(), counts), 0);
    EXPECT_EQ(vreGetVectorParam(h.get(), 2), 7);

    const auto expected = vretest::expectedSizes(n0, b, 7, n3, n4, n7);
    EXPECT_EQ(expected[1], 21);
    std::vector<double> values(1000);
    for (size_t j = 0; j < values.size(); ++j) values[j] = static_cast<double>(j);
    for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
        ASSERT_EQ(vreSetVectorItem(h.get(), i, values.data()), 0) << i;
        EXPECT_EQ(vreGetVectorSize(h.get(), i), expected[static_cast<size_t>(i)]) << i;
    }
    EXPECT_EQ(vectorItem(h.get(), 1), std::vector<double>(values.begin(), values.begin() + 21));

    // A buffer keeps its first length when the parameters change.
    vreSetVectorParam(h.get(), 0, 5);
    ASSERT_EQ(vreSetVectorItem(h.get(), 0, values.data() + 1), 0);
    EXPECT_EQ(vectorItem(h.get(), 0), std::vector<double>(values.begin() + 1, values.begin() + 25));

    // P sums only the first B counts, and saturates rather than wrapping.
    vreSetVectorParam(h.get(), 1, 1);
    ASSERT_EQ(vreSetBodyPanelCount(h.get(), counts), 0);
    EXPECT_EQ(vreGetVectorParam(h.get(), 2), 3);
    auto big = create();
    vreSetVectorParam(big.get(), 1, 3);
    const int32_t huge[3] = {INT32_MAX, INT32_MAX, 5};
    ASSERT_EQ(vreSetBodyPanelCount(big.get(), huge), 0);
    EXPECT_EQ(vreGetVectorParam(big.get(), 2), INT32_MAX);
}

TEST(VreHandle, SizesThatDoNotFitGive2000) {
    auto h = create();
    double value = 1.0;
    vreSetVectorParam(h.get(), 0, -1);
    EXPECT_EQ(vreSetVectorItem(h.get(), 0, &value), F_ERR_MEMORY);
    vreSetVectorParam(h.get(), 0, INT32_MAX / 12 + 1);  // 12 * N0 passes 2^31 - 1
    EXPECT_EQ(vreSetVectorItem(h.get(), 0, &value), F_ERR_MEMORY);
    // N7 * N4 * N3 would wrap 64 bits if multiplied blindly ...
    vreSetVectorParam(h.get(), 3, INT32_MAX);
    vreSetVectorParam(h.get(), 4, INT32_MAX);
    vreSetVectorParam(h.get(), 7, INT32_MAX);
    EXPECT_EQ(vreSetVectorItem(h.get(), 22, &value), F_ERR_MEMORY);
    EXPECT_EQ(vreGetVectorSize(h.get(), 22), 0);
    // ... while a zero factor makes an empty item whatever the others are.
    vreSetVectorParam(h.get(), 7, 0);
    EXPECT_EQ(vreSetVectorItem(h.get(), 22, &value), 0);
    int32_t status = -1;
    EXPECT_TRUE(vectorItem(h.get(), 22, &status).empty());
    EXPECT_EQ(status, 0);

    int32_t counts[1] = {1};
    const char name[VRE_NAME_LENGTH] = "x";
    vreSetVectorParam(h.get(), 1, -2);
    EXPECT_EQ(vreSetBodyPanelCount(h.get(), counts), F_ERR_MEMORY);
    EXPECT_EQ(vreGetBodyPanelCount(h.get(), counts), F_ERR_VALUE);
    EXPECT_EQ(vreSetBodyNames(h.get(), name), F_ERR_MEMORY);
    vreSetVectorParam(h.get(), 1, INT32_MAX / VRE_NAME_LENGTH + 1);  // names pass 2^31 - 1 bytes
    EXPECT_EQ(vreSetBodyNames(h.get(), name), F_ERR_MEMORY);
}

TEST(VreHandle, BodyNamesAndSymmetry) {
    auto h = create();
    vreSetVectorParam(h.get(), 1, 2);
    char raw[2 * VRE_NAME_LENGTH];
    EXPECT_EQ(vreGetBodyNames(h.get(), raw), VRE_NOT_SET);
    ASSERT_EQ(vreSetBodyNames(h.get(), vretest::packNames({"hull", "buoy"}).data()), 0);
    EXPECT_EQ(vretest::bodyNames(h.get()), (std::vector<std::string>{"hull", "buoy"}));
    // More bodies than stored names: the extra fields come back empty.
    vreSetVectorParam(h.get(), 1, 3);
    EXPECT_EQ(vretest::bodyNames(h.get()), (std::vector<std::string>{"hull", "buoy", ""}));

    int32_t s0 = 0, s1 = 0;
    EXPECT_EQ(vreSetSymmetry(h.get(), 0, -3), 0);
    vreGetSymmetry(h.get(), &s0, &s1);
    EXPECT_EQ(s0, 0);
    EXPECT_EQ(s1, -3);
}

TEST(VreUnits, UnitsOfAnotherQuantityAreRefused) {
    auto h = create();
    const int32_t key = kKeys[1], base = vretest::unitSeq(key, 1), second = vretest::unitSeq(key, 2);
    ASSERT_NE(second, -1) << "the quantity needs a second unit";
    int32_t unit = 0, mode = 0, user = 0;
    EXPECT_EQ(vreSetVectorItemUnit(h.get(), 1, foreignUnit(key)), F_ERR_UNIT);
    EXPECT_EQ(vreSetVectorItemUnit(h.get(), 1, second), 0);
    // The mode is stored even when the unit is refused.
    EXPECT_EQ(vreSetVectorItemUnitConversion(h.get(), 1, VRE_CONVERT_EXPLICIT, foreignUnit(key)), F_ERR_UNIT);
    vreGetVectorItemUnitInfo(h.get(), 1, nullptr, &unit, &mode, &user);
    EXPECT_EQ(unit, second);
    EXPECT_EQ(mode, VRE_CONVERT_EXPLICIT);
    EXPECT_EQ(user, base);

    EXPECT_EQ(vreSetScalarItemUnit(h.get(), 0, foreignUnit(110244)), F_ERR_UNIT);
    EXPECT_EQ(vreSetScalarItemUnitConversion(h.get(), 0, VRE_CONVERT_BASE, foreignUnit(110244)), F_ERR_UNIT);
    vreGetScalarItemUnitInfo(h.get(), 0, nullptr, &unit, &mode, &user);
    EXPECT_EQ(unit, vretest::unitSeq(110244, 1));
    EXPECT_EQ(user, unit);
    EXPECT_EQ(mode, VRE_CONVERT_BASE);
}

TEST(VreUnits, VectorValuesConvertByMode) {
    auto h = create();
    const int32_t key = kKeys[2], base = vretest::unitSeq(key, 1), second = vretest::unitSeq(key, 2);
    ASSERT_NE(second, -1);
    vreSetVectorParam(h.get(), 1, 1);
    const int32_t counts[1] = {3};
    vreSetBodyPanelCount(h.get(), counts);  // item 2 has P = 3 elements
    const std::vector<double> in = {1.0, VRE_DELETE_VALUE, 250.0};
    auto stored = [&] {
        int32_t mode = 0, user = 0;
        vreGetVectorItemUnitInfo(h.get(), 2, nullptr, nullptr, &mode, &user);
        vreSetVectorItemUnitConversion(h.get(), 2, VRE_CONVERT_NONE, user);
        auto values = vectorItem(h.get(), 2);
        vreSetVectorItemUnitConversion(h.get(), 2, mode, user);
        return values;
    };

    // Mode 2: handed in and out in the item's user unit, stored in its own.
    ASSERT_EQ(vreSetVectorItemUnitConversion(h.get(), 2, VRE_CONVERT_EXPLICIT, second), 0);
    ASSERT_EQ(vreSetVectorItem(h.get(), 2, in.data()), 0);
    auto out = vectorItem(h.get(), 2);
    EXPECT_DOUBLE_EQ(out[0], 1.0);
    EXPECT_DOUBLE_EQ(out[2], 250.0);
    out = stored();
    EXPECT_DOUBLE_EQ(out[0], convert(second, 1.0, base));
    EXPECT_EQ(out[1], VRE_DELETE_VALUE);
    EXPECT_DOUBLE_EQ(out[2], convert(second, 250.0, base));

    // Mode 3: out in the first unit of the sequence, from a storage unit now
    // the second one (the stored numbers are not converted by that change).
    const double kept = out[2];
    ASSERT_EQ(vreSetVectorItemUnit(h.get(), 2, second), 0);
    vreSetVectorItemUnitConversion(h.get(), 2, VRE_CONVERT_BASE, base);
    out = vectorItem(h.get(), 2);
    EXPECT_DOUBLE_EQ(out[2], convert(second, kept, base));
    EXPECT_EQ(out[1], VRE_DELETE_VALUE);

    // Mode 1: the unit library's user unit of the quantity.
    int32_t previous = 0;
    ASSERT_NE(qtyGetUserUnit(key, &previous), 0);
    ASSERT_NE(qtySetUserUnit(key, base), 0);
    vreSetVectorItemUnitConversion(h.get(), 2, VRE_CONVERT_USER, base);
    double expected = 0.0;
    ASSERT_NE(qtyConvertToUserUnit(key, second, kept, &expected), 0);
    EXPECT_DOUBLE_EQ(vectorItem(h.get(), 2)[2], expected);
    ASSERT_EQ(vreSetVectorItem(h.get(), 2, in.data()), 0);
    out = stored();
    EXPECT_DOUBLE_EQ(out[2], convert(base, 250.0, second));
    EXPECT_EQ(out[1], VRE_DELETE_VALUE);
    qtySetUserUnit(key, previous);
}

TEST(VreUnits, ScalarValuesConvertByMode) {
    auto h = create();
    const int32_t key = 110244, base = vretest::unitSeq(key, 1), second = vretest::unitSeq(key, 2);
    ASSERT_NE(second, -1);
    ASSERT_EQ(vreSetScalarItemUnitConversion(h.get(), 0, VRE_CONVERT_EXPLICIT, second), 0);
    EXPECT_DOUBLE_EQ(vreGetScalarItem(h.get(), 0), convert(base, 9.80665, second));
    ASSERT_EQ(vreSetScalarItem(h.get(), 0, 32.0), 0);
    EXPECT_DOUBLE_EQ(vreGetScalarItem(h.get(), 0), 32.0);
    vreSetScalarItemUnitConversion(h.get(), 0, VRE_CONVERT_NONE, second);
    EXPECT_DOUBLE_EQ(vreGetScalarItem(h.get(), 0), convert(second, 32.0, base));

    // Mode 3 with the storage unit moved to the second unit.
    ASSERT_EQ(vreSetScalarItemUnit(h.get(), 0, second), 0);
    vreSetScalarItemUnitConversion(h.get(), 0, VRE_CONVERT_BASE, base);
    ASSERT_EQ(vreSetScalarItem(h.get(), 0, 2.0), 0);
    EXPECT_DOUBLE_EQ(vreGetScalarItem(h.get(), 0), 2.0);
    vreSetScalarItemUnitConversion(h.get(), 0, 7, base);  // an unknown mode converts nothing
    EXPECT_DOUBLE_EQ(vreGetScalarItem(h.get(), 0), convert(base, 2.0, second));
}
