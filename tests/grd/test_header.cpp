// Header object: creation defaults and refusals, destruction, type texts,
// file-level attributes, map projection and custom blocks.
#include <cstring>
#include <string>

#include "test_header_support.h"

namespace {

using grdtest::Codes;
using grdtest::GrdTest;

class Header : public GrdTest {};

uint32_t bitsOf(float f) {
    uint32_t u;
    std::memcpy(&u, &f, 4);
    return u;
}
uint64_t bitsOf(double d) {
    uint64_t u;
    std::memcpy(&u, &d, 8);
    return u;
}

TEST_F(Header, NewHeaderHasTheDocumentedDefaults) {
    HeaderHandle h = nullptr;
    ASSERT_EQ(grdHeaderCreate(F_NEQTIME_FIXEDSPACE_ALLITEMS, "title", "app", 7, 3, 2, &h), 0);
    header_ = h;
    EXPECT_EQ(grdGetFileType(h), 4);
    EXPECT_STREQ(grdGetFileTitle(h), "title");
    EXPECT_STREQ(grdGetAppTitle(h), "app");
    EXPECT_EQ(grdGetAppVersionNo(h), 7);
    EXPECT_EQ(grdGetNoOfItems(h), 3);
    EXPECT_EQ(grdGetItemStatsType(h), 2);
    EXPECT_EQ(grdGetDataType(h), 0);
    EXPECT_EQ(bitsOf(grdGetDeleteValFloat(h)), 0x8554AD2Eu);
    EXPECT_EQ(bitsOf(grdGetDeleteValDouble(h)), 0x8AFE07B27DD78B14ull);
    EXPECT_EQ(grdGetDeleteValByte(h), 0);
    EXPECT_EQ(grdGetDeleteValInt(h), 2147483647);
    EXPECT_EQ(grdGetDeleteValUnsignedInt(h), 2147483647u);
    EXPECT_EQ(grdGetGeoInfoType(h), 0);
    EXPECT_EQ(grdGetTimeAxisType(h), 0);
    EXPECT_EQ(grdIsFileCompressed(h), 0);
    EXPECT_EQ(grdGetEncodeKeySize(h), 0);
    EXPECT_EQ(h->modifyTimes, 1);
    EXPECT_EQ(h->largestTime, F_DELETE_VALUE_DOUBLE);
    // Items start empty, with the float delete value as references.
    float x = 0, alpha = 0;
    ItemHandle item = grdItemD(h, 3);
    ASSERT_NE(item, nullptr);
    EXPECT_EQ(grdGetItemAxisType(item), 0);
    EXPECT_EQ(grdGetItemRefCoords(item, &x, nullptr, nullptr), 0);
    EXPECT_EQ(grdGetItemAxisOrientation(item, &alpha, nullptr, nullptr), 0);
    EXPECT_EQ(bitsOf(x), 0x8554AD2Eu);
    EXPECT_EQ(bitsOf(alpha), 0x8554AD2Eu);
    const char* name = nullptr;
    const char* unitText = nullptr;
    EXPECT_EQ(grdGetItemInfo_(item, nullptr, &name, &unitText, nullptr), 0);
    EXPECT_STREQ(name, "");
    EXPECT_STREQ(unitText, "");
    // Null titles are taken as empty; the file type is not validated here.
    HeaderHandle other = nullptr;
    ASSERT_EQ(grdHeaderCreate(3, nullptr, nullptr, 0, 1, 1, &other), 0);
    EXPECT_STREQ(grdGetFileTitle(other), "");
    EXPECT_EQ(grdGetFileType(other), 3);
    grdHeaderDestroy(&other);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Header, CreationRefusesBadStatisticsTypesAndItemCounts) {
    HeaderHandle h = reinterpret_cast<HeaderHandle>(0x1);
    EXPECT_EQ(grdHeaderCreate(1, "t", "a", 0, 0, 1, &h), 2010);
    EXPECT_EQ(h, nullptr);
    h = reinterpret_cast<HeaderHandle>(0x1);
    EXPECT_EQ(grdHeaderCreate(1, "t", "a", 0, 1, 4, &h), 2010);
    EXPECT_EQ(h, nullptr);
    EXPECT_EQ(grdHeaderCreate(1, "t", "a", 0, 1, 0, &h), 2010);
    EXPECT_EQ(grdHeaderCreate(1, "t", "a", 0, -5, 1, nullptr), 2010);
    EXPECT_EQ(takeCodes(), (Codes{2010, 2010, 2010, 2010}));
}

TEST_F(Header, DestroyNullsTheHandleAndRefusesNull) {
    HeaderHandle h = makeHeader(1, 2, 3);
    header_ = nullptr;
    ASSERT_EQ(grdAddCustomBlock(h, 1, "b", 1, "abcd"), 0);
    EXPECT_EQ(grdHeaderDestroy(&h), 0);
    EXPECT_EQ(h, nullptr);
    EXPECT_EQ(grdHeaderDestroy(&h), 1000);
    EXPECT_EQ(grdHeaderDestroy(nullptr), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000}));
}

TEST_F(Header, DestroyReleasesAttachedStatesOnce) {
    static int released = 0;
    released = 0;
    HeaderHandle h = makeHeader();
    header_ = nullptr;
    h->extension.release = [](GrdHeader* hh) {
        ++released;
        EXPECT_NE(hh->items, nullptr);  // the plug-in goes before the items
        hh->extension = GrdAttachedState{};
    };
    h->legacy.release = [](GrdHeader* hh) {
        released += 10;
        hh->legacy = GrdAttachedState{};
    };
    grdHeaderDestroy(&h);
    EXPECT_EQ(released, 11);
}

TEST_F(Header, TypeTextsAndVersion) {
    EXPECT_STREQ(grdFileTypeStr(0), "F_UNDEFINED_FILE_TYPE");
    EXPECT_STREQ(grdFileTypeStr(1), "F_EQTIME_FIXEDSPACE_ALLITEMS");
    EXPECT_STREQ(grdFileTypeStr(2), "F_EQTIME_TVARSPACE_ALLITEMS");
    EXPECT_STREQ(grdFileTypeStr(4), "F_NEQTIME_FIXEDSPACE_ALLITEMS");
    EXPECT_STREQ(grdFileTypeStr(8), "F_NEQTIME_FIXEDSPACE_VARITEMS");
    EXPECT_STREQ(grdFileTypeStr(16), "F_NEQTIME_TVARSPACE_VARITEMS");
    EXPECT_STREQ(grdFileTypeStr(3), "*** FileType error ***");
    EXPECT_STREQ(grdFileTypeStr(-1), "*** FileType error ***");
    EXPECT_STREQ(grdTimeAxisTypeStr(0), "F_UNDEFINED_TAXIS");
    EXPECT_STREQ(grdTimeAxisTypeStr(1), "F_TM_EQ_AXIS");
    EXPECT_STREQ(grdTimeAxisTypeStr(2), "F_TM_NEQ_AXIS");
    EXPECT_STREQ(grdTimeAxisTypeStr(3), "F_CAL_EQ_AXIS");
    EXPECT_STREQ(grdTimeAxisTypeStr(4), "F_CAL_NEQ_AXIS");
    EXPECT_STREQ(grdTimeAxisTypeStr(5), "*** TimeAxis error ***");
    EXPECT_STREQ(grdSimpleTypeStr(4), "integer*4");
    EXPECT_STREQ(grdSimpleTypeStr(2), "double");
    EXPECT_EQ(grdGetVersionCurrent(), 206);
}

TEST_F(Header, AttributesRoundTripAndTitlesAreReplacedByCopies) {
    HeaderHandle h = makeHeader();
    std::string title = "a longer file title";
    EXPECT_EQ(grdSetFileTitle(h, title.c_str()), 0);
    title[0] = 'X';  // the header holds a copy
    EXPECT_STREQ(grdGetFileTitle(h), "a longer file title");
    // Setting a title from the header's own lent text works.
    EXPECT_EQ(grdSetAppTitle(h, grdGetFileTitle(h)), 0);
    EXPECT_STREQ(grdGetAppTitle(h), "a longer file title");
    EXPECT_EQ(grdSetFileTitle(h, ""), 0);
    EXPECT_STREQ(grdGetFileTitle(h), "");
    EXPECT_EQ(grdSetAppVersionNo(h, -3), 0);
    EXPECT_EQ(grdGetAppVersionNo(h), -3);
    EXPECT_EQ(grdSetDataType(h, -7), 0);
    EXPECT_EQ(grdGetDataType(h), -7);
    EXPECT_EQ(grdSetDeleteValFloat(h, 1.5f), 0);
    EXPECT_EQ(grdSetDeleteValDouble(h, -2.5), 0);
    EXPECT_EQ(grdSetDeleteValByte(h, 'x'), 0);
    EXPECT_EQ(grdSetDeleteValInt(h, -1), 0);
    EXPECT_EQ(grdSetDeleteValUnsignedInt(h, 4000000000u), 0);
    EXPECT_EQ(grdGetDeleteValFloat(h), 1.5f);
    EXPECT_EQ(grdGetDeleteValDouble(h), -2.5);
    EXPECT_EQ(grdGetDeleteValByte(h), 'x');
    EXPECT_EQ(grdGetDeleteValInt(h), -1);
    EXPECT_EQ(grdGetDeleteValUnsignedInt(h), 4000000000u);
    EXPECT_EQ(grdParamModifyTimes(h, 0), 0);
    EXPECT_EQ(h->modifyTimes, 0);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Header, NullHeaderGivesFallbacksAndReports1000) {
    EXPECT_EQ(grdGetFileType(nullptr), 0);
    EXPECT_STREQ(grdGetFileTitle(nullptr), "");
    EXPECT_STREQ(grdGetAppTitle(nullptr), "");
    EXPECT_EQ(grdGetAppVersionNo(nullptr), -1);
    EXPECT_EQ(grdGetDataType(nullptr), 0);
    EXPECT_EQ(grdGetItemStatsType(nullptr), 0);
    EXPECT_EQ(grdGetDeleteValFloat(nullptr), 0.0f);
    EXPECT_EQ(grdGetDeleteValDouble(nullptr), 0.0);
    EXPECT_EQ(grdGetDeleteValByte(nullptr), 0);
    EXPECT_EQ(grdGetDeleteValInt(nullptr), 0);
    EXPECT_EQ(grdGetDeleteValUnsignedInt(nullptr), 0u);
    EXPECT_EQ(grdGetGeoInfoType(nullptr), 0);
    EXPECT_EQ(grdGetNoOfItems(nullptr), 0);
    EXPECT_EQ(grdGetTimeAxisType(nullptr), 0);
    EXPECT_EQ(takeCodes(), Codes(14, 1000));
    EXPECT_EQ(grdSetFileTitle(nullptr, "t"), 1000);
    EXPECT_EQ(grdSetAppVersionNo(nullptr, 1), 1000);
    EXPECT_EQ(grdSetDeleteValDouble(nullptr, 1), 1000);
    EXPECT_EQ(grdParamModifyTimes(nullptr, 1), 1000);
    EXPECT_EQ(grdSetGeoInfoUTMProj(nullptr, "p", 0, 0, 0), 1000);
    EXPECT_EQ(grdAddCustomBlock(nullptr, 1, "b", 0, nullptr), 1000);
    EXPECT_EQ(takeCodes(), Codes(6, 1000));
}

TEST_F(Header, ProjectionSetGetAndUndefine) {
    HeaderHandle h = makeHeader();
    const char* proj = nullptr;
    double lon = 9, lat = 9, orient = 9;
    EXPECT_EQ(grdGetGeoInfoUTMProj(h, &proj, &lon, &lat, &orient), 1000);  // none set
    EXPECT_EQ(takeCodes(), Codes{1000});
    EXPECT_EQ(proj, nullptr);
    EXPECT_EQ(grdSetGeoInfoUTMProj(h, "UTM-33", 12.5, 55.25, -3.0), 0);
    EXPECT_EQ(grdGetGeoInfoType(h), 1);
    EXPECT_EQ(grdGetGeoInfoUTMProj(h, &proj, &lon, &lat, &orient), 0);
    EXPECT_STREQ(proj, "UTM-33");
    EXPECT_EQ(proj, h->projection.get());  // lent, not copied
    EXPECT_EQ(lon, 12.5);
    EXPECT_EQ(lat, 55.25);
    EXPECT_EQ(orient, -3.0);
    EXPECT_EQ(grdGetGeoInfoUTMProj(h, nullptr, nullptr, nullptr, nullptr), 0);
    h->geoInfoType = 2;  // as an unknown value read from a file
    EXPECT_EQ(grdGetGeoInfoUTMProj(h, &proj, nullptr, nullptr, nullptr), 2010);
    EXPECT_EQ(takeCodes(), Codes{2010});
    EXPECT_EQ(grdSetGeoInfoUndefined(h), 0);
    EXPECT_EQ(grdGetGeoInfoType(h), 0);
    EXPECT_TRUE(h->projection.isNull());
}

TEST_F(Header, ProjectionUpdateKeepsTheStoredLength) {
    HeaderHandle h = makeHeader();
    // Not possible without a projection: 2010, no report.
    EXPECT_EQ(grdUpdateGeoInfoUTMProj(h, "X", 1, 2, 3), 2010);
    ASSERT_EQ(grdSetGeoInfoUTMProj(h, "UTM-33N", 1, 2, 3), 0);
    EXPECT_EQ(grdUpdateGeoInfoUTMProj(h, "UTM-9", 4, 5, 6), 0);
    const char* proj = nullptr;
    double lon = 0, lat = 0, orient = 0;
    grdGetGeoInfoUTMProj(h, &proj, &lon, &lat, &orient);
    EXPECT_STREQ(proj, "UTM-9  ");
    EXPECT_EQ(lon, 4);
    EXPECT_EQ(lat, 5);
    EXPECT_EQ(orient, 6);
    // Longer: refused, nothing changed, no report.
    EXPECT_EQ(grdUpdateGeoInfoUTMProj(h, "UTM-33N-long", 7, 8, 9), 2010);
    grdGetGeoInfoUTMProj(h, &proj, &lon, nullptr, nullptr);
    EXPECT_STREQ(proj, "UTM-9  ");
    EXPECT_EQ(lon, 4);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Header, CustomBlocksKeepInsertionOrderAndCopyTheirTypesWidth) {
    HeaderHandle h = makeHeader();
    CustomBlockHandle block = reinterpret_cast<CustomBlockHandle>(0x1);
    EXPECT_EQ(grdGetCustomBlockRef(h, &block), 0);
    EXPECT_EQ(block, nullptr);

    const char bytes[] = "abcdefgh";
    const double doubles[5] = {1, 2, 3, 4, 5};
    const int16_t shorts[3] = {-1, 2, -3};
    EXPECT_EQ(grdAddCustomBlock(h, 3, "bytes", 5, bytes), 0);
    EXPECT_EQ(grdAddCustomBlock(h, 2, "doubles", 5, doubles), 0);
    EXPECT_EQ(grdAddCustomBlock(h, 6, "shorts", 3, shorts), 0);
    EXPECT_EQ(grdAddCustomBlock(h, 9, "no data", 4, nullptr), 0);

    struct Expect {
        int32_t type;
        const char* name;
        int32_t count;
        size_t bytes;
        const void* data;
    };
    const Expect expected[] = {{3, "bytes", 5, 5, bytes},
                               {2, "doubles", 5, 40, doubles},
                               {6, "shorts", 3, 6, shorts},
                               {9, "no data", 4, 0, nullptr}};
    ASSERT_EQ(grdGetCustomBlockRef(h, &block), 0);
    for (const Expect& e : expected) {
        ASSERT_NE(block, nullptr);
        int32_t type = 0, count = 0;
        const char* name = nullptr;
        const void* data = reinterpret_cast<const void*>(0x2);
        CustomBlockHandle next = nullptr;
        ASSERT_EQ(grdGetCustomBlock(block, &type, &name, &count, &data, &next), 0);
        EXPECT_EQ(type, e.type);
        EXPECT_STREQ(name, e.name);
        EXPECT_EQ(count, e.count);
        if (e.data != nullptr) {
            ASSERT_NE(data, e.data);  // a copy
            EXPECT_EQ(std::memcmp(data, e.data, e.bytes), 0);
        } else {
            EXPECT_EQ(data, reinterpret_cast<const void*>(0x2));  // left untouched for other types
        }
        block = next;
    }
    EXPECT_EQ(block, nullptr);
    EXPECT_EQ(grdGetCustomBlock(nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});
}

TEST_F(Header, CustomBlocksRefuseNegativeCountsAndMissingData) {
    HeaderHandle h = makeHeader();
    EXPECT_EQ(grdAddCustomBlock(h, 1, "neg", -1, "abcd"), 2010);
    EXPECT_EQ(grdAddCustomBlock(h, 1, "missing", 2, nullptr), 1000);
    EXPECT_EQ(grdAddCustomBlock(h, 4, "empty", 0, nullptr), 0);  // no elements: no data needed
    EXPECT_EQ(takeCodes(), (Codes{2010, 1000}));
    CustomBlockHandle block = nullptr;
    grdGetCustomBlockRef(h, &block);
    ASSERT_NE(block, nullptr);
    EXPECT_STREQ(block->name.get(), "empty");
    EXPECT_EQ(block->next, nullptr);
}

TEST_F(Header, LongCustomBlockChainsDestroyWithoutRecursion) {
    HeaderHandle h = makeHeader();
    for (int i = 0; i < 200000; ++i) {
        GrdCustomBlock* b = new GrdCustomBlock;  // fast path: link directly
        b->next = std::move(h->customBlocks);
        h->customBlocks.reset(b);
    }
    EXPECT_EQ(grdHeaderDestroy(&header_), 0);
}

}  // namespace
