// Item statistics: global extremes and delete counts per data type, the
// per-element sums against values computed here independently (mean,
// unbiased variance, lag-one autocorrelation with delete values breaking the
// chain), conversion into the caller's unit, the failures, and statistics
// that survive closing and reading the file again.
#include <cmath>
#include <cstring>
#include <limits>
#include <vector>

#include "grd/grddynamic.h"
#include "test_dynamic_support.h"
#if TOVA_TEST_POSIX
#include <sys/wait.h>
#include <unistd.h>
#endif

namespace {

using dyntest::Codes;
using dyntest::DynamicTest;

constexpr float kDelF = F_DELETE_VALUE_FLOAT;
constexpr double kDelD = F_DELETE_VALUE_DOUBLE;

class Stats : public DynamicTest {
protected:
    void globalOf(int32_t itemNo, double& min, double& max, int32_t& deletes) {
        ASSERT_EQ(grdGetItemStatsGlobal(grdItemD(header_, itemNo), &min, &max, &deletes), 0);
    }
};

// What the statistics of one element should be, computed from its series
// the plain way (two passes).
struct Expected {
    double min = kDelD, max = kDelD, mean = kDelD, stdDev = kDelD, autoCorrelation = kDelD;
    int32_t values = 0, deletes = 0, pairs = 0;
};

Expected expectedOf(const std::vector<double>& series, double del) {
    Expected e;
    std::vector<double> x;
    double lagSum = 0;
    bool chained = false;
    double previous = 0;
    for (double v : series) {
        if (v == del) {
            ++e.deletes;
            chained = false;
            continue;
        }
        if (chained) {
            lagSum += previous * v;
            ++e.pairs;
        }
        previous = v;
        chained = true;
        x.push_back(v);
    }
    e.values = static_cast<int32_t>(x.size());
    if (x.empty()) return e;
    e.min = e.max = x[0];
    double sum = 0;
    for (double v : x) {
        e.min = std::min(e.min, v);
        e.max = std::max(e.max, v);
        sum += v;
    }
    const double n = static_cast<double>(x.size());
    e.mean = sum / n;
    double variance = kDelD;
    if (x.size() > 1) {
        double ss = 0;
        for (double v : x) ss += (v - e.mean) * (v - e.mean);
        variance = ss / (n - 1);
        e.stdDev = std::sqrt(variance);
    }
    if (e.pairs > 0 && variance != kDelD && variance != 0)
        e.autoCorrelation = (lagSum / e.pairs - e.mean * e.mean) / variance;
    return e;
}

void expectElement(HeaderHandle h, int32_t itemNo, int32_t element, const Expected& e) {
    double min, max, mean, stdDev, ac;
    int32_t values, deletes, pairs;
    ASSERT_EQ(grdGetItemStats(h, itemNo, element, &min, &max, &mean, &stdDev, &ac, &values, &deletes, &pairs), 0);
    auto near = [](double got, double want) {
        if (want == kDelD) return got == kDelD;
        return std::fabs(got - want) <= 1e-9 * std::max(1.0, std::fabs(want));
    };
    EXPECT_EQ(min, e.min) << element;
    EXPECT_EQ(max, e.max) << element;
    EXPECT_PRED2(near, mean, e.mean) << element;
    EXPECT_PRED2(near, stdDev, e.stdDev) << element;
    EXPECT_PRED2(near, ac, e.autoCorrelation) << element;
    EXPECT_EQ(values, e.values) << element;
    EXPECT_EQ(deletes, e.deletes) << element;
    EXPECT_EQ(pairs, e.pairs) << element;
}

TEST_F(Stats, GlobalStatisticsKeepExtremesAndCountDeleteValues) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    defineItem(1, RCF_FLOAT, 5);
    double min = 0, max = 0;
    int32_t deletes = -1;
    globalOf(1, min, max, deletes);
    EXPECT_EQ(min, kDelD);  // nothing yet
    EXPECT_EQ(max, kDelD);
    EXPECT_EQ(deletes, 0);
    const float a[5] = {1.0f, kDelF, -3.0f, 7.0f, kDelF};
    ASSERT_EQ(grdCalcStatistics(header_, 1, a), 0);
    globalOf(1, min, max, deletes);
    EXPECT_EQ(min, -3.0);
    EXPECT_EQ(max, 7.0);
    EXPECT_EQ(deletes, 2);
    const float allDeleted[5] = {kDelF, kDelF, kDelF, kDelF, kDelF};
    ASSERT_EQ(grdCalcStatistics(header_, 1, allDeleted), 0);
    globalOf(1, min, max, deletes);
    EXPECT_EQ(min, -3.0);
    EXPECT_EQ(max, 7.0);
    EXPECT_EQ(deletes, 7);
    const float b[5] = {2.5f, 10.0f, 0.0f, -1.0f, 3.0f};
    ASSERT_EQ(grdCalcStatistics(header_, 1, b), 0);
    globalOf(1, min, max, deletes);
    EXPECT_EQ(min, -3.0);
    EXPECT_EQ(max, 10.0);
    // A long array: every lane and the tail of the scan count.
    defineItem(1, RCF_FLOAT, 1003);
    std::vector<float> many(1003);
    for (size_t i = 0; i < many.size(); ++i) many[i] = i % 7 == 3 ? kDelF : static_cast<float>(i % 101) - 50.0f;
    many[1002] = 99.5f;
    many[1001] = -77.0f;
    ASSERT_EQ(grdCalcStatistics(header_, 1, many.data()), 0);
    globalOf(1, min, max, deletes);
    EXPECT_EQ(min, -77.0);
    EXPECT_EQ(max, 99.5);
    EXPECT_EQ(deletes, 143);
    EXPECT_EQ(takeCodes(), Codes{});
}

// Items of 2 MiB and more have their extremes scanned beside the
// record's write (on a helper thread where the process may use two
// processors): the statistics are those of the plain scan, on the writer's
// header and in the file.
TEST_F(Stats, LargeItemsScannedBesideTheWriteKeepExactGlobalStatistics) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 1024, 600);  // 2.4 MB
    defineItem(2, RCF_DOUBLE, 600, 500);  // 2.4 MB
    create();
    std::vector<float> f(1024 * 600);
    std::vector<double> d(600 * 500);
    double fMin = 1e300, fMax = -1e300, dMin = 1e300, dMax = -1e300;
    int32_t fDeletes = 0, dDeletes = 0;
    for (int32_t s = 0; s < 3; ++s) {
        for (size_t i = 0; i < f.size(); ++i) {
            f[i] = (i + s) % 13 == 0 ? kDelF : static_cast<float>((i * 7919 + s * 31) % 100003) * 0.5f - 20000.0f;
            if (f[i] == kDelF) {
                ++fDeletes;
                continue;
            }
            fMin = std::min(fMin, static_cast<double>(f[i]));
            fMax = std::max(fMax, static_cast<double>(f[i]));
        }
        for (size_t i = 0; i < d.size(); ++i) {
            d[i] = (i * 3 + s) % 17 == 0 ? kDelD : std::sin(static_cast<double>(i + s * 7)) * 1e5;
            if (d[i] == kDelD) {
                ++dDeletes;
                continue;
            }
            dMin = std::min(dMin, d[i]);
            dMax = std::max(dMax, d[i]);
        }
        ASSERT_EQ(grdWriteItemTimeStep(header_, file_, s, f.data()), 0);
        ASSERT_EQ(grdWriteItemTimeStep(header_, file_, s, d.data()), 0);
    }
    auto expectGlobal = [&](HeaderHandle h) {
        double min = 0, max = 0;
        int32_t deletes = 0;
        ASSERT_EQ(grdGetItemStatsGlobal(grdItemD(h, 1), &min, &max, &deletes), 0);
        EXPECT_EQ(min, fMin);
        EXPECT_EQ(max, fMax);
        EXPECT_EQ(deletes, fDeletes);
        ASSERT_EQ(grdGetItemStatsGlobal(grdItemD(h, 2), &min, &max, &deletes), 0);
        EXPECT_EQ(min, dMin);
        EXPECT_EQ(max, dMax);
        EXPECT_EQ(deletes, dDeletes);
    };
    expectGlobal(header_);
    reopen();
    expectGlobal(rh());

    // The pass itself: the same result as the scan on the caller's thread,
    // handed to the helper exactly when that is worth it; a second pass while
    // the first may still run (on the helper or here) gives the same.
    GrdExtremesBeside beside(d.data(), static_cast<int64_t>(d.size()), kDelD);
    GrdExtremesBeside second(d.data(), static_cast<int64_t>(d.size()), kDelD);
    EXPECT_EQ(beside.onHelper(), GrdExtremesBeside::worthwhile(static_cast<int64_t>(d.size() * 8)));
    EXPECT_EQ(second.result().max, dMax);
    const GrdExtremes got = beside.result();
    const GrdExtremes want = grdScanExtremes(d.data(), static_cast<int64_t>(d.size()), kDelD);
    EXPECT_EQ(got.min, want.min);
    EXPECT_EQ(got.max, want.max);
    EXPECT_EQ(got.values, want.values);
    EXPECT_EQ(got.deletes, want.deletes);
    EXPECT_FALSE(GrdExtremesBeside(d.data(), 1000, kDelD).onHelper());  // too short to be worth it

#if TOVA_TEST_POSIX
    // A child made by fork has no helper thread: it scans by itself (an alarm
    // ends it should it wait for the parent's helper). The verdict comes
    // through a pipe: a leak checker may set the child's exit status (the
    // parent's helper thread is not in the child).
    int verdict[2];
    ASSERT_EQ(pipe(verdict), 0);
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        alarm(10);
        GrdExtremesBeside inChild(d.data(), static_cast<int64_t>(d.size()), kDelD);
        const char ok = !inChild.onHelper() && inChild.result().max == dMax ? 'y' : 'n';
        _exit(write(verdict[1], &ok, 1) == 1 ? 0 : 1);
    }
    close(verdict[1]);
    char answer = 0;
    EXPECT_EQ(read(verdict[0], &answer, 1), 1);
    close(verdict[0]);
    EXPECT_EQ(answer, 'y');
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
#endif
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(Stats, EveryDataTypeContributesWithItsOwnDeleteValue) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 6, 1);
    for (int32_t type = RCF_DOUBLE; type <= RCF_UINT2; ++type) defineItem(type - 1, type, 4);
    const double d[4] = {kDelD, -1.0e300, 2.5, 1.0e-300};
    const int8_t bytes[4] = {0, -100, 100, 5};  // the byte delete value is 0
    const int32_t ints[4] = {2147483647, -2147483647 - 1, 17, 2147483646};
    const uint32_t uints[4] = {2147483647u, 4000000000u, 0u, 3u};
    const int16_t shorts[4] = {-32768, 32767, 0, -5};  // no delete value
    const uint16_t ushorts[4] = {65535, 0, 1, 2};
    const void* data[6] = {d, bytes, ints, uints, shorts, ushorts};
    for (int32_t i = 1; i <= 6; ++i) ASSERT_EQ(grdCalcStatistics(header_, i, data[i - 1]), 0);
    struct Want {
        double min, max;
        int32_t deletes;
    };
    const Want want[6] = {{-1.0e300, 2.5, 1},          {-100, 100, 1},     {-2147483648.0, 2147483646.0, 1},
                          {0, 4000000000.0, 1},        {-32768, 32767, 0}, {0, 65535, 0}};
    for (int32_t i = 1; i <= 6; ++i) {
        double min = 0, max = 0;
        int32_t deletes = -1;
        globalOf(i, min, max, deletes);
        EXPECT_EQ(min, want[i - 1].min) << i;
        EXPECT_EQ(max, want[i - 1].max) << i;
        EXPECT_EQ(deletes, want[i - 1].deletes) << i;
    }
}

// Statistics type 2, written through the file: every element against its
// series computed here.
TEST_F(Stats, ElementStatisticsMatchAnIndependentComputation) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, 2);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 5);
    defineItem(2, RCF_INT4, 2);
    create();
    // Element 0: ordinary values; 1: a delete value between two runs;
    // 2: one value only; 3: all deleted; 4: constant.
    const float series[6][5] = {
        {1.5f, 4.0f, kDelF, kDelF, 2.0f},   {-2.0f, kDelF, 7.0f, kDelF, 2.0f}, {3.25f, 1.0f, kDelF, kDelF, 2.0f},
        {0.5f, 2.0f, kDelF, kDelF, 2.0f},   {8.0f, 3.0f, kDelF, kDelF, 2.0f},  {-6.5f, 5.0f, kDelF, kDelF, 2.0f}};
    const int32_t ints[6][2] = {{1, 2147483647}, {5, 2147483647}, {2147483647, 2147483647},
                                {-4, 2147483647}, {9, 2147483647}, {10, 2147483647}};
    for (int s = 0; s < 6; ++s) {
        ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, series[s]), 0);
        ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, ints[s]), 0);
    }
    for (int e = 0; e < 5; ++e) {
        std::vector<double> column;
        for (int s = 0; s < 6; ++s) column.push_back(series[s][e] == kDelF ? kDelD : series[s][e]);
        expectElement(header_, 1, e, expectedOf(column, kDelD));
    }
    for (int e = 0; e < 2; ++e) {
        std::vector<double> column;
        for (int s = 0; s < 6; ++s) column.push_back(ints[s][e] == 2147483647 ? kDelD : ints[s][e]);
        expectElement(header_, 2, e, expectedOf(column, kDelD));
    }
    // Five values of element 1 make three pairs: its delete value breaks the chain.
    int32_t pairs = -1;
    ASSERT_EQ(grdGetItemStats(header_, 1, 1, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, &pairs),
              0);
    EXPECT_EQ(pairs, 3);
    // Every output is optional.
    EXPECT_EQ(grdGetItemStats(header_, 1, 0, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr),
              0);
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(Stats, ElementStatisticsSurviveClosingAndReadingTheFile) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 1, 3);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_DOUBLE, 3);
    create();
    const double steps[4][3] = {{1.0, kDelD, 10.0}, {2.0, 5.0, 20.0}, {4.0, 6.0, kDelD}, {8.0, 7.5, 40.0}};
    for (int s = 0; s < 4; ++s) ASSERT_EQ(grdWriteItemTimeStep(header_, file_, s, steps[s]), 0);
    reopen();
    for (int e = 0; e < 3; ++e) {
        std::vector<double> column;
        for (int s = 0; s < 4; ++s) column.push_back(steps[s][e]);
        expectElement(rh(), 1, e, expectedOf(column, kDelD));
    }
    double min = 0, max = 0;
    int32_t deletes = 0;
    ASSERT_EQ(grdGetItemStatsGlobal(grdItemD(rh(), 1), &min, &max, &deletes), 0);
    EXPECT_EQ(min, 1.0);
    EXPECT_EQ(max, 40.0);
    EXPECT_EQ(deletes, 2);
}

TEST_F(Stats, ExtremesAndMeanAreGivenInTheCallersUnit) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 2);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    ItemHandle item = defineItem(1, RCF_DOUBLE, 2, 0, dyntest::kWaterLevel, dyntest::kCentimetre);
    create();
    const double a[2] = {150.0, kDelD};
    const double b[2] = {250.0, 30.0};
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, a), 0);
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, b), 0);  // stored as given: mode 0
    ASSERT_EQ(grdSetItemUnitConversion(item, 2, dyntest::kMetre), 0);
    double min = 0, max = 0, mean = 0, stdDev = 0;
    ASSERT_EQ(grdGetItemStatsGlobal(item, &min, &max, nullptr), 0);
    EXPECT_DOUBLE_EQ(min, 0.3);
    EXPECT_DOUBLE_EQ(max, 2.5);
    ASSERT_EQ(grdGetItemStats(header_, 1, 0, &min, &max, &mean, &stdDev, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_DOUBLE_EQ(min, 1.5);
    EXPECT_DOUBLE_EQ(max, 2.5);
    EXPECT_DOUBLE_EQ(mean, 2.0);
    EXPECT_DOUBLE_EQ(stdDev, std::sqrt(5000.0));  // not converted
    ASSERT_EQ(grdGetItemStats(header_, 1, 1, &min, &max, &mean, nullptr, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_DOUBLE_EQ(min, 0.3);
    EXPECT_DOUBLE_EQ(mean, 0.3);
    // The values written in the caller's unit end up in the item's unit.
    const double c[2] = {kDelD, 0.05};
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, c), 0);
    ASSERT_EQ(grdSetItemUnitConversion(item, 0, 0), 0);
    ASSERT_EQ(grdGetItemStats(header_, 1, 1, &min, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_DOUBLE_EQ(min, 5.0);
    int32_t deletes = 0;
    ASSERT_EQ(grdGetItemStatsGlobal(item, nullptr, nullptr, &deletes), 0);
    EXPECT_EQ(deletes, 2);
}

TEST_F(Stats, GettersRefuseWhatTheStatisticsTypeDoesNotKeep) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    defineItem(1, RCF_FLOAT, 3);
    double mean = 0;
    EXPECT_EQ(grdGetItemStats(header_, 1, 0, nullptr, nullptr, &mean, nullptr, nullptr, nullptr, nullptr, nullptr),
              1000);
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 2);
    defineItem(1, RCF_FLOAT, 3);
    EXPECT_EQ(grdGetItemStats(header_, 1, 3, nullptr, nullptr, &mean, nullptr, nullptr, nullptr, nullptr, nullptr),
              2008);
    EXPECT_EQ(grdGetItemStats(header_, 1, -1, nullptr, nullptr, &mean, nullptr, nullptr, nullptr, nullptr, nullptr),
              2008);
    EXPECT_EQ(grdGetItemStats(header_, 2, 0, nullptr, nullptr, &mean, nullptr, nullptr, nullptr, nullptr, nullptr),
              2007);
    EXPECT_EQ(grdGetItemStats(nullptr, 1, 0, nullptr, nullptr, &mean, nullptr, nullptr, nullptr, nullptr, nullptr),
              1000);
    EXPECT_EQ(grdGetItemStatsGlobal(nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 2008, 2008, 2007, 1000, 1000}));
    // No values yet: mean and spread are the delete value.
    double stdDev = 0, ac = 0;
    ASSERT_EQ(grdGetItemStats(header_, 1, 0, nullptr, nullptr, &mean, &stdDev, &ac, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(mean, kDelD);
    EXPECT_EQ(stdDev, kDelD);
    EXPECT_EQ(ac, kDelD);
    // An unknown statistics type is refused, the global extremes still kept.
    header_->statsType = 5;
    const float v[3] = {4.0f, 5.0f, 6.0f};
    EXPECT_EQ(grdCalcStatistics(header_, 1, v), 2010);
    EXPECT_EQ(grdGetItemStats(header_, 1, 0, nullptr, nullptr, &mean, nullptr, nullptr, nullptr, nullptr, nullptr),
              2010);
    double max = 0;
    ASSERT_EQ(grdGetItemStatsGlobal(grdItemD(header_, 1), nullptr, &max, nullptr), 0);
    EXPECT_EQ(max, 6.0);
    header_->statsType = 2;
    EXPECT_EQ(takeCodes(), (Codes{2010, 2010}));
}

TEST_F(Stats, CompressedItemsKeepStatisticsPerStoredElement) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 2);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    const int32_t xKey[] = {1, 2};
    const int32_t yKey[] = {0, 1};
    ASSERT_EQ(grdSetEncodeKey(header_, xKey, yKey, nullptr, 2), 0);
    defineItem(1, RCF_FLOAT, 3, 2);
    create();
    const float full[6] = {100.0f, 1.0f, 100.0f, 100.0f, 100.0f, 2.0f};  // positions 1 and 5 stored
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, full), 0);
    double min = 0, max = 0;
    ASSERT_EQ(grdGetItemStatsGlobal(grdItemD(header_, 1), &min, &max, nullptr), 0);
    EXPECT_EQ(min, 1.0);
    EXPECT_EQ(max, 2.0);
    ASSERT_EQ(grdGetItemStats(header_, 1, 1, nullptr, &max, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(max, 2.0);
    EXPECT_EQ(grdGetItemStats(header_, 1, 2, nullptr, &max, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr),
              2008);
    EXPECT_EQ(takeCodes(), Codes{2008});
}

}  // namespace
