// Argument checks, the zeroed allocation, and the header model's behaviour
// when memory fails (injected failures and absurd sizes).
#include <algorithm>
#include <cstdlib>
#include <limits>
#include <string>

#include "grd/grdio.h"
#include "rcf/rcf_internal.h"
#include "test_header_support.h"

// Absurd sizes must come back as 2000 under AddressSanitizer too, as they do
// from the C library. (The one definition for the whole test_grd program.)
extern "C" const char* __asan_default_options() { return "allocator_may_return_null=1"; }

namespace {

using grdtest::Codes;
using grdtest::GrdTest;

class Checks : public GrdTest {};

TEST_F(Checks, NullArgumentsGive1000ThroughTheDispatcherWithTheCallersModule) {
    RcfFile unbound;  // a file of no header
    FileHandle file = &unbound;
    GrdHeader header;
    GrdItem item;
    GrdCustomBlock block;
    EXPECT_EQ(grdCheckHeader(nullptr, "m1", 11), 1000);
    EXPECT_EQ(grdCheckFile(nullptr, "m2", 12), 1000);
    EXPECT_EQ(grdCheckItem(nullptr, "m3", 13), 1000);
    EXPECT_EQ(grdCheckVector(nullptr, "m4", 14), 1000);
    EXPECT_EQ(grdCheckCustomBlock(nullptr, "m5", 15), 1000);
    ASSERT_EQ(grdtest::reports().size(), 5u);
    EXPECT_EQ(grdtest::reports()[0].module, "m1");
    EXPECT_EQ(grdtest::reports()[4].module, "m5");
    grdtest::reports().clear();

    EXPECT_EQ(grdCheckHeader(&header, "m", 1), 0);
    EXPECT_EQ(grdCheckFile(file, "m", 1), 0);
    EXPECT_EQ(grdCheckItem(&item, "m", 1), 0);
    EXPECT_EQ(grdCheckVector(&item, "m", 1), 0);
    EXPECT_EQ(grdCheckCustomBlock(&block, "m", 1), 0);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Checks, CompositeChecksStopAtTheFirstFailure) {
    RcfFile unbound;  // a file of no header
    FileHandle file = &unbound;
    GrdHeader header;
    GrdItem vector;
    EXPECT_EQ(grdCheckHeaderFile(nullptr, nullptr, "m", 1), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});  // the file is not checked after the header failed
    EXPECT_EQ(grdCheckHeaderFile(&header, nullptr, "m", 1), 1000);
    EXPECT_EQ(grdCheckHeaderFile(&header, file, "m", 1), 0);
    EXPECT_EQ(grdCheckVectorFile(nullptr, nullptr, "m", 1), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000}));
    EXPECT_EQ(grdCheckVectorFile(&vector, nullptr, "m", 1), 1000);
    EXPECT_EQ(grdCheckVectorFile(&vector, file, "m", 1), 0);
    EXPECT_EQ(takeCodes(), Codes{1000});
}

TEST_F(Checks, ItemNumberIsCheckedAgainstTheHeadersItemCount) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 3);
    EXPECT_EQ(grdCheckHeaderItemNo(h, 1, "m", 1), 0);
    EXPECT_EQ(grdCheckHeaderItemNo(h, 3, "m", 1), 0);
    EXPECT_EQ(grdCheckHeaderItemNo(h, 0, "m", 1), 2007);
    EXPECT_EQ(grdCheckHeaderItemNo(h, 4, "m", 1), 2007);
    ASSERT_EQ(grdtest::reports().size(), 2u);
    EXPECT_EQ(grdtest::reports()[0].header, h);  // the handler receives the header
    grdtest::reports().clear();
    // A null header: 1000, whatever the number.
    EXPECT_EQ(grdCheckHeaderItemNo(nullptr, 0, "m", 1), 1000);
    EXPECT_EQ(grdCheckHeaderItemNo(nullptr, 1, "m", 1), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000}));
}

TEST_F(Checks, ChecksAndTheZeroedAllocationTraceThemselves) {
    GrdHeader header;
    testing::internal::CaptureStdout();
    grdDebugOn(1);
    grdCheckHeader(&header, "m", 1);
    void* p = nullptr;
    EXPECT_EQ(grdCheckAllocZeroed(&p, 64, "m", 1), 0);
    grdDebugOn(0);
    const std::string out = testing::internal::GetCapturedStdout();
    ASSERT_NE(p, nullptr);
    for (int i = 0; i < 64; ++i) EXPECT_EQ(static_cast<unsigned char*>(p)[i], 0);
    std::free(p);
    EXPECT_NE(out.find("->{grdCheckHeader"), std::string::npos) << out;
    EXPECT_NE(out.find("<-}grdCheckHeader [0]"), std::string::npos) << out;
    // The allocation shares its entry name with grdCheckTypeSize; its exit
    // line carries the pointer.
    EXPECT_NE(out.find("->{grdCheckTypeSize"), std::string::npos) << out;
    EXPECT_NE(out.find(" [0]\n", out.find("<-}grdCheckTypeSize ")), std::string::npos) << out;
}

TEST_F(Checks, FailedZeroedAllocationGives2000AndNullsThePointer) {
    void* p = reinterpret_cast<void*>(0x1);
    grdTestFailAllocation(1);
    EXPECT_EQ(grdCheckAllocZeroed(&p, 16, "m", 7), 2000);
    EXPECT_EQ(p, nullptr);
    EXPECT_EQ(takeCodes(), Codes{2000});
}

TEST_F(Checks, ApiCallsTraceEnterAndExitWithTheirStatus) {
    HeaderHandle h = makeHeader();
    testing::internal::CaptureStdout();
    grdDebugOn(1);
    grdSetFileTitle(h, "abc");
    grdSetFileTitle(nullptr, "abc");
    grdDebugOn(0);
    const std::string out = testing::internal::GetCapturedStdout();
    EXPECT_NE(out.find("->{grdSetFileTitle <abc>"), std::string::npos) << out;
    EXPECT_NE(out.find("<-}grdSetFileTitle [0]"), std::string::npos) << out;
    EXPECT_NE(out.find("<-}grdSetFileTitle [1000]"), std::string::npos) << out;
    takeCodes();
}

// Every allocation of a full header build fails in turn: each failure gives
// 2000 and leaves a header that destroys without leaks (checked by the
// sanitizer build).
TEST_F(Checks, EveryInjectedAllocationFailureIsReportedAndLeavesADestroyableHeader) {
    const double coords[6] = {0, 1, 2, 3, 4, 5};
    const int32_t key[4] = {0, 1, 2, 3};
    int failures = 0;
    for (int32_t nth = 1; nth < 40; ++nth) {
        HeaderHandle h = nullptr;
        grdTestFailAllocation(nth);
        int32_t worst = grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "file title", "app title", 1, 2, 2, &h);
        if (h != nullptr) {
            ItemHandle item = grdItemD(h, 1);
            worst = std::max(worst, grdSetItemInfo(h, item, QTY_ITEM_UNDEFINED, "a name", 0, 1));
            worst = std::max(worst, grdSetItemInfo_(h, grdItemD(h, 2), QTY_ITEM_UNDEFINED, "b", "unit text", 2));
            worst = std::max(worst, grdSetItemAxisNeqD2(item, 0, 2, 1, coords, coords, 0));
            worst = std::max(worst, grdSetGeoInfoUTMProj(h, "UTM-32", 1, 2, 3));
            worst = std::max(worst, grdAddCustomBlock(h, 2, "block", 3, coords));
            worst = std::max(worst, grdSetEncodeKey(h, key, key, nullptr, 4));
            worst = std::max(worst, grdSetEqCalendarAxis(h, "2020-01-01", "00:00:00", 1400, 0, 1, 0));
        } else {
            EXPECT_EQ(worst, 2000) << nth;
        }
        EXPECT_TRUE(worst == 0 || worst == 2000) << nth << ": " << worst;
        if (worst == 2000) ++failures;
        grdTestFailAllocation(0);
        for (int32_t code : takeCodes()) EXPECT_EQ(code, 2000) << nth;
        if (h != nullptr) {
            EXPECT_EQ(grdHeaderDestroy(&h), 0);
        }
        if (worst == 0) break;  // past the last allocation
    }
    EXPECT_GT(failures, 8);
}

TEST_F(Checks, AbsurdSizesGive2000InsteadOfCrashing) {
    HeaderHandle h = nullptr;
    // An item array of 2^31 - 1 records does not fit in memory.
    EXPECT_EQ(grdHeaderCreate(1, "", "", 0, std::numeric_limits<int32_t>::max(), 1, &h), 2000);
    EXPECT_EQ(h, nullptr);
    EXPECT_EQ(takeCodes(), Codes{2000});

    // 1290^3 elements fit the 32-bit interfaces, but their statistics
    // (72 bytes each) do not fit in memory: the axis is kept, the statistics
    // are absent.
    h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 2);
    ItemHandle item = makeItem();
    EXPECT_EQ(grdSetItemAxisEqD3(item, 0, 1290, 1290, 1290, 0, 0, 0, 1, 1, 1), 2000);
    EXPECT_EQ(takeCodes(), Codes{2000});
    EXPECT_EQ(grdGetItemElements(item), 1290 * 1290 * 1290);
    EXPECT_EQ(item->elemStats, nullptr);
    EXPECT_EQ(item->elemStatsCount, 0);
}

TEST_F(Checks, ElementCountsBeyondTheInt32RangeAreRefusedNotWrapped) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 2);
    ItemHandle item = makeItem();
    ASSERT_EQ(grdSetItemAxisEqD2(item, 0, 10, 10, 0, 0, 1, 1), 0);
    // 65536^2 = 2^32 wraps to 0 in 32 bits.
    EXPECT_EQ(grdSetItemAxisEqD2(item, 0, 65536, 65536, 0, 0, 1, 1), 2010);
    EXPECT_EQ(grdSetItemAxisEqD4(item, 0, 2000, 2000, 2000, 2000, 0, 0, 0, 0, 1, 1, 1, 1), 2010);
    EXPECT_EQ(grdSetItemAxisTvarD3(item, 0, 2000, 2000, 2000), 2010);
    // Node counts of a curvilinear axis are checked too: (X+1)(Y+1) > 2^31-1.
    const double one = 0.0;
    EXPECT_EQ(grdSetItemAxisCurveLinearD2(item, 0, 46340, 46340, &one, &one, 0), 2010);
    EXPECT_EQ(grdSetItemAxisNeqD1(item, 0, std::numeric_limits<int32_t>::max(), &one, 0), 2010);
    EXPECT_EQ(takeCodes(), (Codes{2010, 2010, 2010, 2010, 2010}));
    // The previous axis and its statistics stand.
    EXPECT_EQ(grdGetItemAxisType(item), F_EQ_AXIS_D2);
    EXPECT_EQ(item->elemStatsCount, 100);

    // The byte count of 2^30 doubles does not fit either.
    ASSERT_EQ(grdSetItemInfo(header_, item, QTY_ITEM_UNDEFINED, "big", 0, 2), 0);
    item->axisType = F_EQ_AXIS_D2;  // sizes as a header reader might store them
    item->size[0] = 32768;
    item->size[1] = 32768;
    EXPECT_EQ(grdGetItemElements(item), 1 << 30);
    EXPECT_EQ(grdGetItemBytes(item), 0);
    EXPECT_EQ(takeCodes(), Codes{2010});
}

}  // namespace
