// Finding one item of one time step (grdFindItemDynamic) in files whose
// items differ in type and size, in any order: the items before the wanted
// one are passed in one move of the file position, and what is read there,
// and after it, must be exactly what item-by-item skipping gives.
#include <algorithm>
#include <random>
#include <utility>
#include <vector>

#include "test_dynamic_support.h"

namespace {

using dyntest::Codes;
using dyntest::DynamicTest;

class FindItem : public DynamicTest {};

TEST_F(FindItem, AnyItemOfAnyTimeStepInAnyOrder) {
    constexpr int32_t kSteps = 9;
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 6, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 3, 2);
    defineItem(2, RCF_DOUBLE, 0);
    defineItem(3, RCF_INT4, 5);
    defineItem(4, RCF_BYTE, 7);
    defineItem(5, RCF_DOUBLE, 4);
    defineItem(6, RCF_UINT2, 3, 3);
    create();
    writeSteps(kSteps);
    reopen();

    std::vector<std::pair<int32_t, int32_t>> wanted;
    for (int32_t t = 0; t < kSteps; ++t)
        for (int32_t n = 1; n <= 6; ++n) wanted.emplace_back(t, n);
    std::shuffle(wanted.begin(), wanted.end(), std::mt19937(5));
    for (const auto& [t, n] : wanted) {
        ASSERT_EQ(grdFindItemDynamic(rh(), file_, t, n), 0) << t << " " << n;
        EXPECT_EQ(rh()->timeStepsDone, t);
        EXPECT_EQ(rh()->nextItem, n - 1);
        expectStep(rh(), t, n, t);
        // The file stands where the cursor says: the next item follows.
        if (n < 6) expectStep(rh(), t, n + 1, t);
        else if (t + 1 < kSteps) expectStep(rh(), t + 1, 1, t + 1);
    }
    // Forward within the time step from an item already passed.
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 4, 2), 0);
    expectStep(rh(), 4, 2, 4);
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 4, 6), 0);
    expectStep(rh(), 4, 6, 4);
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(FindItem, TimesInTheFileAndCompressedItems) {
    constexpr int32_t kSteps = 7;
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 4, 1);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_DOUBLE, 0);
    defineItem(2, RCF_FLOAT, 4, 3);
    defineItem(3, RCF_DOUBLE, 4, 3);
    defineItem(4, RCF_FLOAT, 0);
    // Grid positions y * 4 + x: 0, 3, 5, 10, 8.
    const int32_t xKey[] = {0, 3, 1, 2, 0};
    const int32_t yKey[] = {0, 0, 1, 2, 2};
    const int64_t positions[] = {0, 3, 5, 10, 8};
    ASSERT_EQ(grdSetEncodeKey(header_, xKey, yKey, nullptr, 5), 0);
    create();
    std::vector<double> times;
    for (int32_t s = 0; s < kSteps; ++s) times.push_back(10.0 * s + 0.5);
    writeSteps(kSteps, times);
    reopen();
    ASSERT_EQ(grdParamModifyTimes(rh(), 0), 0);

    std::vector<std::pair<int32_t, int32_t>> wanted;
    for (int32_t t = 0; t < kSteps; ++t)
        for (int32_t n = 1; n <= 4; ++n) wanted.emplace_back(t, n);
    std::shuffle(wanted.begin(), wanted.end(), std::mt19937(11));
    for (const auto& [t, n] : wanted) {
        ASSERT_EQ(grdFindItemDynamic(rh(), file_, t, n), 0) << t << " " << n;
        std::vector<double> values(12, 7.0);  // room for either data type
        float f[12] = {};
        double time = -1;
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, &time, n == 2 || n == 4 ? static_cast<void*>(f) : values.data()),
                  0)
            << t << " " << n;
        EXPECT_EQ(time, 10.0 * t + 0.5) << t << " " << n;
        if (n == 1) {
            EXPECT_EQ(values[0], dyntest::doubleValue(t, 1, 0)) << t;
        } else if (n == 4) {
            EXPECT_EQ(f[0], dyntest::floatValue(t, 4, 0)) << t;
        } else {
            for (const int64_t e : positions) {
                const double got = n == 2 ? f[e] : values[static_cast<size_t>(e)];
                const double want = n == 2 ? dyntest::floatValue(t, 2, e) : dyntest::doubleValue(t, 3, e);
                EXPECT_EQ(got, want) << t << " " << n << " " << e;
            }
        }
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

}  // namespace
