// Header stream writer and reader: golden bytes, block order, round trips of
// rich headers through real files (every axis kind, time-axis kind,
// statistics type, associations, custom blocks), foreign byte order, older
// tags, unknown tags, and damaged or hostile streams.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "test_stream_support.h"

using grdtest::Codes;
using streamtest::doubles;
using streamtest::doublesN;
using streamtest::floats;
using streamtest::HeaderPtr;
using streamtest::ints;
using streamtest::putLE;
using streamtest::RawFile;
using streamtest::readHeaderFile;
using streamtest::text;
using streamtest::uints;
using streamtest::writeHeaderFile;
using testutil::readBytes;
using testutil::TempDir;

namespace {

class StreamTest : public grdtest::GrdTest {
protected:
    // Sets item n's info (undefined quantity, unit 0, float data).
    ItemHandle info(int32_t n, const char* name) {
        ItemHandle item = grdItemD(header_, n);
        EXPECT_EQ(grdSetItemInfo(header_, item, QTY_ITEM_UNDEFINED, name, 0, RCF_FLOAT), 0);
        return item;
    }

    // A header with every field set and one item of every writable axis kind
    // of a fixed-space file, per-element statistics of type stats.
    HeaderHandle makeRichHeader(int32_t stats = F_ITEM_STATS_ELEMENT) {
        makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 9, stats);
        EXPECT_EQ(grdSetFileTitle(header_, "rich file"), 0);
        EXPECT_EQ(grdSetAppTitle(header_, "tova tests"), 0);
        EXPECT_EQ(grdSetAppVersionNo(header_, 42), 0);
        EXPECT_EQ(grdSetDataType(header_, -7), 0);
        EXPECT_EQ(grdSetDeleteValFloat(header_, 9.5f), 0);
        EXPECT_EQ(grdSetDeleteValDouble(header_, -7.25), 0);
        EXPECT_EQ(grdSetDeleteValByte(header_, 'x'), 0);
        EXPECT_EQ(grdSetDeleteValInt(header_, -3), 0);
        EXPECT_EQ(grdSetDeleteValUnsignedInt(header_, 4000000000u), 0);
        EXPECT_EQ(grdSetGeoInfoUTMProj(header_, "UTM-32N", 9.0, 54.5, 1.25), 0);
        EXPECT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 3600.0, 60.0, 2), 0);
        header_->timeAxis.time.timeSteps = 5;

        ItemHandle it = info(1, "level");
        EXPECT_EQ(grdSetItemValueType(it, 3), 0);
        EXPECT_EQ(grdSetItemRefCoords(it, 1, 2, 3), 0);
        EXPECT_EQ(grdSetItemAxisOrientation(it, 4, 5, 6), 0);
        EXPECT_EQ(grdSetAssocStatic(header_, 1, 2), 0);
        EXPECT_EQ(grdSetAssocStatic(header_, 1, 7), 0);
        EXPECT_EQ(grdSetItemAxisEqD1(info(2, "eq1"), 0, 4, 10.0f, 0.5f), 0);
        const double x1[] = {0, 1, 3, 5};  // the last boundary continues the last spacing
        EXPECT_EQ(grdSetItemAxisNeqD1(info(3, "neq1"), 0, 3, x1, 0), 0);
        EXPECT_EQ(grdSetItemAxisEqD2(info(4, "eq2"), 0, 3, 2, 1, 2, 0.25f, 0.75f), 0);
        const double x2[] = {0, 1, 4}, y2[] = {-1, 0, 2, 7};
        EXPECT_EQ(grdSetItemAxisNeqD2(info(5, "neq2"), 0, 2, 3, x2, y2, 0), 0);
        EXPECT_EQ(grdSetItemAxisEqD3(info(6, "eq3"), 0, 2, 2, 2, 1, 2, 3, 4, 5, 6), 0);
        const double x3[] = {0, 1}, y3[] = {0, 1, 2}, z3[] = {5, 6};
        EXPECT_EQ(grdSetItemAxisNeqD3(info(7, "neq3"), 0, 1, 2, 1, x3, y3, z3, 0), 0);
        const double cx[] = {0, 1, 2, 0, 1, 2}, cy[] = {0, 0, 0, 1, 1, 1};
        EXPECT_EQ(grdSetItemAxisCurveLinearD2(info(8, "curve2"), 0, 2, 1, cx, cy, 0), 0);
        const double n8[] = {1, 2, 3, 4, 5, 6, 7, 8};
        EXPECT_EQ(grdSetItemAxisCurveLinearD3(info(9, "curve3"), 0, 1, 1, 1, n8, n8, n8, 0), 0);

        for (int32_t n = 1; n <= 9; ++n) {
            GrdItem* item = grdHeaderItem(header_, n);
            item->globalMax = 100.0 + n;
            item->globalMin = -100.0 - n;
            item->globalDeletes = n;
            for (int32_t e = 0; item->elemStats && e < item->elemStatsCount; ++e) {
                item->elemStats[e].sum = n * 1000 + e;
                item->elemStats[e].values = e;
            }
        }

        const float f[] = {1.5f, -2.5f};
        const double d[] = {3.25};
        const char b[] = {'a', 'b', 'c'};
        const int32_t i4[] = {-1, 2, -3};
        const uint32_t u4[] = {4000000000u};
        const int16_t i2[] = {-2, 3};
        const uint16_t u2[] = {65535};
        EXPECT_EQ(grdAddCustomBlock(header_, RCF_FLOAT, "floats", 2, f), 0);
        EXPECT_EQ(grdAddCustomBlock(header_, RCF_DOUBLE, "doubles", 1, d), 0);
        EXPECT_EQ(grdAddCustomBlock(header_, RCF_BYTE, "bytes", 3, b), 0);
        EXPECT_EQ(grdAddCustomBlock(header_, RCF_INT4, "ints", 3, i4), 0);
        EXPECT_EQ(grdAddCustomBlock(header_, RCF_UINT4, "uints", 1, u4), 0);
        EXPECT_EQ(grdAddCustomBlock(header_, RCF_INT2, "shorts", 2, i2), 0);
        EXPECT_EQ(grdAddCustomBlock(header_, RCF_UINT2, "ushorts", 1, u2), 0);
        return header_;
    }

    // Round trip through a file: writes, reads back, compares; then writes
    // the read header and checks that the stream bytes are the same.
    HeaderPtr roundTrip(const TempDir& dir) {
        const std::string first = dir.file("first.grd");
        EXPECT_EQ(writeHeaderFile(first, header_), 0);
        int32_t status = -1;
        HeaderPtr back = readHeaderFile(first, &status);
        EXPECT_EQ(status, 0);
        if (!back) return back;
        streamtest::expectSameHeader(*header_, *back);
        const std::string second = dir.file("second.grd");
        EXPECT_EQ(writeHeaderFile(second, back.get()), 0);
        const auto a = readBytes(first), b = readBytes(second);
        EXPECT_EQ(std::vector<uint8_t>(a.begin() + kAppBase, a.end()), std::vector<uint8_t>(b.begin() + kAppBase, b.end()));
        EXPECT_EQ(takeCodes(), Codes{});
        return back;
    }

    static constexpr size_t kAppBase = 130;  // after the record-file header of a "GRD_" file
};

// The stream of a small header, byte by byte.
TEST_F(StreamTest, SmallHeaderGoldenBytes) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetFileTitle(header_, ""), 0);
    ASSERT_EQ(grdSetAppTitle(header_, "A"), 0);
    ASSERT_EQ(grdSetAppVersionNo(header_, 7), 0);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    ASSERT_EQ(grdSetItemAxisEqD1(info(1, "x"), 3, 3, 10.0f, 0.5f), 0);
    TempDir dir;
    const std::string path = dir.file("golden.grd");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);

    std::vector<uint8_t> want;
    const auto block = [&](uint16_t tag) {
        want.push_back(0xFE);
        putLE(want, tag);
    };
    const auto rec = [&](int8_t type, uint32_t count) {
        want.push_back(static_cast<uint8_t>(type));
        putLE(want, count);
    };
    const auto end = [&] { want.push_back(0xFF); };
    const auto int1 = [&](uint16_t tag, int32_t v) {
        block(tag), rec(RCF_INT4, 1), putLE(want, v), end();
    };
    block(10000), end();
    block(10004), rec(RCF_INT2, 1), putLE<int16_t>(want, 1), end();
    block(10001), rec(RCF_BYTE, 1), want.push_back(0), end();  // "" keeps its terminator
    block(10002), rec(RCF_BYTE, 2), want.push_back('A'), want.push_back(0), end();
    int1(10003, 7);
    int1(10012, 0);
    int1(10013, 0);
    int1(10005, 1);
    block(10006), rec(RCF_FLOAT, 1), putLE<uint32_t>(want, 0x8554AD2Eu), end();
    block(10007), rec(RCF_DOUBLE, 1), putLE<uint64_t>(want, 0x8AFE07B27DD78B14ull), end();
    block(10008), rec(RCF_BYTE, 1), want.push_back(0), end();
    int1(10009, 2147483647);
    block(10010), rec(RCF_UINT4, 1), putLE<uint32_t>(want, 2147483647u), end();
    block(20000), end();
    block(20051), rec(RCF_INT4, 1), putLE<int32_t>(want, QTY_UNIT_SECOND);
    rec(RCF_DOUBLE, 2), putLE(want, 0.0), putLE(want, 1.0);
    rec(RCF_INT4, 2), putLE<int32_t>(want, 0), putLE<int32_t>(want, 0), end();
    block(30000), end();
    int1(30001, 1);
    block(30005), rec(RCF_INT4, 1), putLE<int32_t>(want, QTY_ITEM_UNDEFINED);
    rec(RCF_BYTE, 2), want.push_back('x'), want.push_back(0);
    rec(RCF_INT4, 1), putLE<int32_t>(want, 0);
    rec(RCF_INT4, 1), putLE<int32_t>(want, RCF_FLOAT);
    rec(RCF_DOUBLE, 3), putLE(want, -1e-255), putLE(want, -1e-255), putLE(want, 0.0);
    rec(RCF_FLOAT, 3);
    for (int i = 0; i < 6; ++i) {
        if (i == 3) rec(RCF_FLOAT, 3);
        putLE(want, -1e-35f);
    }
    end();
    int1(30006, 0);
    block(31052), rec(RCF_INT4, 2), putLE<int32_t>(want, 3), putLE<int32_t>(want, 3);
    rec(RCF_FLOAT, 2), putLE(want, 0.5f), putLE(want, 10.0f), end();  // EqD1: step first
    block(50000), end();

    const auto bytes = readBytes(path);
    ASSERT_EQ(bytes.size(), kAppBase + want.size());
    EXPECT_EQ(std::vector<uint8_t>(bytes.begin() + kAppBase, bytes.end()), want);
    EXPECT_EQ(std::vector<uint8_t>(bytes.begin() + kAppBase, bytes.begin() + kAppBase + 4),
              (std::vector<uint8_t>{0xFE, 0x10, 0x27, 0xFF}));
}

TEST_F(StreamTest, BlockOrderOfARichHeader) {
    makeRichHeader();
    TempDir dir;
    const std::string path = dir.file("order.grd");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);
    std::vector<int32_t> want = {10000, 10004, 10001, 10002, 10003, 10012, 10013, 10005, 10006, 10007,
                                 10008, 10009, 10010, 10011, 20000, 20051, 30000, 30001};
    const int32_t axisTags[] = {31051, 31052, 31053, 31055, 31056, 31058, 31059, 31061, 31062};
    for (int32_t n = 0; n < 9; ++n) {
        for (int32_t tag : {30005, 30006, axisTags[n], 30003}) want.push_back(tag);
        if (n == 0) want.push_back(30004);
    }
    for (int i = 0; i < 7; ++i) want.push_back(60000);
    want.push_back(50000);
    EXPECT_EQ(streamtest::blockTags(path), want);

    // Without a projection and with statistics type 1: no 10011, no 30003.
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    info(1, "a");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);
    EXPECT_EQ(streamtest::blockTags(path),
              (std::vector<int32_t>{10000, 10004, 10001, 10002, 10003, 10012, 10013, 10005, 10006, 10007, 10008,
                                    10009, 10010, 20000, 20051, 30000, 30001, 30005, 30006, 31051, 50000}));
}

TEST_F(StreamTest, RichHeaderRoundTrip) {
    makeRichHeader(F_ITEM_STATS_ELEMENT);
    TempDir dir;
    HeaderPtr back = roundTrip(dir);
    ASSERT_TRUE(back);
    // What the getters give of the header read back.
    ItemHandle eq1 = grdItemD(back.get(), 2);
    int32_t size = 0;
    float x0 = 0, dx = 0;
    ASSERT_EQ(grdGetItemAxisEqD1(eq1, nullptr, nullptr, &size, &x0, &dx), 0);
    EXPECT_EQ(size, 4);
    EXPECT_EQ(x0, 10.0f);
    EXPECT_EQ(dx, 0.5f);
    EXPECT_EQ(grdGetNoAssocStatic(back.get(), 1), 2);
    EXPECT_EQ(grdGetItemStatsType(back.get()), F_ITEM_STATS_ELEMENT);
    EXPECT_EQ(grdGetItemElements(grdItemD(back.get(), 9)), 1);
    EXPECT_EQ(back->nextItem, 0);
}

TEST_F(StreamTest, TimeVaryingAxesAndGlobalStatisticsRoundTrip) {
    makeHeader(F_EQTIME_TVARSPACE_ALLITEMS, 3, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 2.0, 0), 0);
    ASSERT_EQ(grdSetItemAxisTvarD1(info(1, "t1"), 0, 5), 0);
    ASSERT_EQ(grdSetItemAxisTvarD2(info(2, "t2"), 0, 5, 6), 0);
    ASSERT_EQ(grdSetItemAxisTvarD3(info(3, "t3"), 0, 5, 6, 7), 0);
    TempDir dir;
    HeaderPtr back = roundTrip(dir);
    ASSERT_TRUE(back);
    EXPECT_EQ(back->items[2].elemStats, nullptr);
    EXPECT_EQ(streamtest::blockTags(dir.file("first.grd"))[19], 31054);
}

TEST_F(StreamTest, EveryTimeAxisKindRoundTrips) {
    TempDir dir;
    for (int32_t kind = F_TM_EQ_AXIS; kind <= F_CAL_NEQ_AXIS; ++kind) {
        SCOPED_TRACE("time axis " + std::to_string(kind));
        const bool eq = kind == F_TM_EQ_AXIS || kind == F_CAL_EQ_AXIS;
        makeHeader(eq ? F_EQTIME_FIXEDSPACE_ALLITEMS : F_NEQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_GLOBAL);
        info(1, "a");
        switch (kind) {
            case F_TM_EQ_AXIS: ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 10.0, 0.5, 3), 0); break;
            case F_TM_NEQ_AXIS: ASSERT_EQ(grdSetNeqTimeAxis(header_, QTY_UNIT_SECOND, 10.0, 3), 0); break;
            case F_CAL_EQ_AXIS:
                ASSERT_EQ(grdSetEqCalendarAxis(header_, "2024-02-29", "23:59:58", QTY_UNIT_SECOND, 1.5, 60.0, 4), 0);
                break;
            default:
                ASSERT_EQ(grdSetNeqCalendarAxis(header_, "1999-12-31", "00:00:01", QTY_UNIT_SECOND, 0.0, 4), 0);
                break;
        }
        GrdTimeValues* v = grdTimeAxisValues(header_);
        v->timeSteps = 11;
        if (!eq) v->step = 123.5;  // the span kept in the step field
        HeaderPtr back = roundTrip(dir);
        ASSERT_TRUE(back);
        EXPECT_EQ(streamtest::blockTags(dir.file("first.grd"))[14], 20050 + kind);
    }
}

TEST_F(StreamTest, CustomBlocksOfEveryTypeRoundTrip) {
    makeRichHeader(F_ITEM_STATS_GLOBAL);
    TempDir dir;
    ASSERT_TRUE(roundTrip(dir));

    // A block of a type without elements keeps only its name on disk.
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    info(1, "a");
    ASSERT_EQ(grdAddCustomBlock(header_, 9, "opaque", 3, nullptr), 0);
    ASSERT_EQ(grdAddCustomBlock(header_, RCF_DOUBLE, "empty", 0, nullptr), 0);
    const std::string path = dir.file("custom.grd");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);
    int32_t status = -1;
    HeaderPtr back = readHeaderFile(path, &status);
    ASSERT_TRUE(back) << status;
    const GrdCustomBlock* c = back->customBlocks.get();
    ASSERT_NE(c, nullptr);
    EXPECT_STREQ(c->name.orEmpty(), "opaque");
    EXPECT_EQ(c->count, 0);
    ASSERT_NE(c->next, nullptr);
    EXPECT_STREQ(c->next->name.orEmpty(), "empty");
    EXPECT_EQ(c->next->next, nullptr);
}

// The model keeps size + 1 boundaries, the block 3 x size floats x, y, z.
TEST_F(StreamTest, NonEquidistant1DMapsPointsAndBoundaries) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    const double x[] = {0.5, 1.5, 4.0, 100.0};
    ASSERT_EQ(grdSetItemAxisNeqD1(info(1, "n"), 0, 3, x, 0), 0);
    TempDir dir;
    const std::string path = dir.file("neq1.grd");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);

    // A file whose points carry y and z as well.
    const std::string withYz = dir.file("neq1yz.grd");
    {
        RawFile raw(withYz);
        raw.start(1).item().block(30006, {ints({0})});
        raw.block(31053, {ints({0, 3}), floats({0.5f, 10, 20, 1.5f, 11, 21, 4, 12, 22})}).block(50000);
    }
    int32_t status = -1;
    HeaderPtr back = readHeaderFile(withYz, &status);
    ASSERT_TRUE(back) << status;
    const GrdItem& it = back->items[0];
    ASSERT_EQ(it.size[0], 3);
    EXPECT_EQ(it.coords[0][0], 0.5);
    EXPECT_EQ(it.coords[0][1], 1.5);
    EXPECT_EQ(it.coords[0][2], 4.0);
    EXPECT_EQ(it.coords[0][3], 6.5);  // continues the last spacing
    const double* given = nullptr;
    ASSERT_EQ(grdGetItemAxisNeqD1(grdItemD(back.get(), 1), nullptr, nullptr, nullptr, &given), 0);
    EXPECT_EQ(given, it.coords[0].get());

    // Written again: the same bytes, y and z included.
    const std::string again = dir.file("again.grd");
    ASSERT_EQ(writeHeaderFile(again, back.get()), 0);
    const auto a = readBytes(withYz), b = readBytes(again);
    EXPECT_EQ(std::vector<uint8_t>(a.end() - 60, a.end()), std::vector<uint8_t>(b.end() - 60, b.end()));

    // Set in memory: y and z are 0, the last boundary has no place on disk.
    back = readHeaderFile(path, &status);
    ASSERT_TRUE(back) << status;
    EXPECT_EQ(back->items[0].coords[0][2], 4.0);
    EXPECT_EQ(back->items[0].coords[0][3], 6.5);
    ASSERT_EQ(back->items[0].diskPointCount, 3);
    EXPECT_EQ(back->items[0].diskPoints[4], 0.0f);
    EXPECT_EQ(back->items[0].diskPoints[6], 4.0f);
    // A new axis set on the item forgets the points of the old one.
    ASSERT_EQ(grdSetItemAxisNeqD1(grdItemD(back.get(), 1), 0, 3, x, 0), 0);
    EXPECT_EQ(back->items[0].diskPoints, nullptr);
}

// An item whose unit key is negative is stored under 30002 with its unit
// text, and reads back with unit -1.
TEST_F(StreamTest, UnitTextItemsUseTheTextBlock) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    info(1, "keyed");
    ItemHandle byText = info(2, "texted");
    byText->unit = -1;
    ASSERT_TRUE(byText->unitText.assign("furlong"));
    TempDir dir;
    const std::string path = dir.file("text.grd");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);
    EXPECT_EQ(streamtest::blockTags(path)[20], 30002);
    HeaderPtr back = roundTrip(dir);
    ASSERT_TRUE(back);
    EXPECT_EQ(back->items[1].unit, -1);
    EXPECT_STREQ(back->items[1].unitText.get(), "furlong");
}

TEST_F(StreamTest, WriterRefusesWhatTheFormatCannotHold) {
    TempDir dir;
    const std::string path = dir.file("refused.grd");
    // EqD4: 2010 after the blocks before the axis were written.
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    info(1, "a");
    ASSERT_EQ(grdSetItemAxisEqD4(info(2, "four"), 0, 1, 1, 1, 1, 0, 0, 0, 0, 1, 1, 1, 1), 0);
    EXPECT_EQ(writeHeaderFile(path, header_), F_ERR_VALUE);
    std::vector<int32_t> tags = streamtest::blockTags(path);
    ASSERT_GE(tags.size(), 3u);
    EXPECT_EQ((std::vector<int32_t>(tags.end() - 3, tags.end())), (std::vector<int32_t>{30005, 30006, 50000}));
    EXPECT_EQ(takeCodes(), Codes{F_ERR_VALUE});

    // A unit that does not suit the item type: 2020, nothing of the item written.
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    ItemHandle item = info(1, "a");
    item->itemType = QTY_ITEM_GEOMETRY_1D;
    item->unit = QTY_UNIT_SECOND;
    EXPECT_EQ(writeHeaderFile(path, header_), F_ERR_UNIT);
    tags = streamtest::blockTags(path);
    EXPECT_EQ(tags[tags.size() - 2], 30001);
    takeCodes();

    // Unknown geo info, time axis and statistics types.
    item->itemType = QTY_ITEM_UNDEFINED;
    header_->geoInfoType = 2;
    EXPECT_EQ(writeHeaderFile(path, header_), F_ERR_VALUE);
    header_->geoInfoType = 0;
    header_->timeAxis.type = 0;
    EXPECT_EQ(writeHeaderFile(path, header_), F_ERR_VALUE);
    header_->timeAxis.type = F_TM_EQ_AXIS;
    header_->statsType = 4;
    EXPECT_EQ(writeHeaderFile(path, header_), F_ERR_VALUE);
    header_->statsType = 1;
    EXPECT_EQ(writeHeaderFile(path, header_), 0);
    EXPECT_EQ(takeCodes(), (Codes{F_ERR_VALUE, F_ERR_VALUE, F_ERR_VALUE}));

    EXPECT_EQ(grdWriteHeader(nullptr, nullptr), F_ERR_ARGUMENT);
}

TEST_F(StreamTest, DeleteValuesReachTheFileObject) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    info(1, "a");
    ASSERT_EQ(grdSetDeleteValFloat(header_, 3.5f), 0);
    ASSERT_EQ(grdSetDeleteValDouble(header_, -8.0), 0);
    TempDir dir;
    const std::string path = dir.file("delete.grd");
    FileHandle file = FOpenFileCreate(path.c_str(), 0);
    ASSERT_NE(file, nullptr);
    ASSERT_EQ(grdWriteHeader(header_, file), 0);
    EXPECT_EQ(file->deleteValFloat, 3.5f);
    EXPECT_EQ(file->deleteValDouble, -8.0);
    rcfBlockWrite(kTagStaticStart, file, nullptr);
    ASSERT_EQ(FCloseFile(&file), 0);

    int32_t status = -1;
    streamtest::FilePtr in(FOpenFileRead(path.c_str(), &status));
    ASSERT_TRUE(in);
    in->ownerMark = 0;
    HeaderPtr back(grdReadHeader(in.get(), &status));
    ASSERT_TRUE(back) << status;
    EXPECT_EQ(in->deleteValFloat, 3.5f);
    EXPECT_EQ(in->deleteValDouble, -8.0);
    EXPECT_EQ(in->ownerMark, 1u);
    // The stop block is left for the data sections.
    EXPECT_EQ(FQueryLogicalBlock(in.get()), kTagStaticStart);
}

TEST_F(StreamTest, ForeignByteOrderReadsTheSame) {
    makeRichHeader(F_ITEM_STATS_ELEMENT);
    TempDir dir;
    const std::string path = dir.file("host.grd");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);
    const std::string swapped = dir.file("swapped.grd");
    const auto hostBytes = readBytes(path);
    const auto swappedBytes = streamtest::swapRecordFile(hostBytes);
    ASSERT_NE(swappedBytes, hostBytes);
    testutil::writeBytes(swapped, swappedBytes);
    int32_t status = -1;
    HeaderPtr back = readHeaderFile(swapped, &status);
    ASSERT_TRUE(back) << status;
    streamtest::expectSameHeader(*header_, *back);
    EXPECT_EQ(takeCodes(), Codes{});
}

// Older files: time tags 20001-20004 with a text unit, axis tags
// 31001-31010 without the axis unit, no 30006.
TEST_F(StreamTest, OlderTagsAreRead) {
    TempDir dir;
    const std::string path = dir.file("older.grd");
    {
        RawFile raw(path);
        raw.block(10000).block(10004, {streamtest::shorts({4})}).block(20000);
        raw.block(20004, {text("2001-02-03"), text("04:05:06"), text("hour"), doubles({1.5, 9.0}), ints({3, 1})});
        raw.block(30000).block(30001, {ints({5})});
        raw.item("d0").block(31001);
        raw.item("d1").block(31002, {ints({4}), floats({0.5f, 2.0f})});
        raw.item("n1").block(31003, {ints({2}), floats({1, 0, 0, 2, 0, 0})});
        raw.item("n2").block(31006, {ints({1, 2}), doublesN(2), doublesN(3, 10)});
        raw.item("t3").block(31010, {ints({2, 3, 4})});
        raw.block(50000);
    }
    int32_t status = -1;
    HeaderPtr back = readHeaderFile(path, &status);
    ASSERT_TRUE(back) << status;
    EXPECT_EQ(back->fileType, 4);
    EXPECT_EQ(back->timeAxis.type, F_CAL_NEQ_AXIS);
    EXPECT_EQ(back->timeAxis.calendar.unit, -1);
    EXPECT_STREQ(back->timeAxis.calendar.unitText.get(), "hour");
    EXPECT_STREQ(back->timeAxis.startDate, "2001-02-03");
    EXPECT_STREQ(back->timeAxis.startTime, "04:05:06");
    EXPECT_EQ(back->timeAxis.calendar.step, 9.0);
    EXPECT_EQ(back->timeAxis.calendar.timeSteps, 3);
    ASSERT_EQ(back->noOfItems, 5);
    const int32_t types[] = {F_EQ_AXIS_D0, F_EQ_AXIS_D1, F_NEQ_AXIS_D1, F_NEQ_AXIS_D2, F_TVAR_AXIS_D3};
    for (int n = 0; n < 5; ++n) {
        const GrdItem& it = back->items[n];
        EXPECT_EQ(it.axisType, types[n]);
        EXPECT_EQ(it.valueType, 0);
        EXPECT_EQ(it.axisUnit, grdBaseUnit(grdAxisGeometryType(types[n])));
        EXPECT_EQ(it.refX, 4.0f);
    }
    EXPECT_EQ(back->items[1].step[0], 0.5f);
    EXPECT_EQ(back->items[1].origin[0], 2.0f);
    EXPECT_EQ(back->items[2].coords[0][2], 3.0);
    EXPECT_EQ(back->items[3].coords[1][2], 12.0);
    EXPECT_EQ(back->items[4].size[2], 4);

    // The older time forms 20001-20003 as well.
    for (int kind = 1; kind <= 3; ++kind) {
        {
            RawFile raw(path);
            raw.block(20000);
            if (kind == 3) {
                raw.block(20003, {text("2001-02-03"), text("04:05:06"), text("s"), doubles({1, 2}), ints({3, 4})});
            } else {
                raw.block(static_cast<uint16_t>(20000 + kind), {text("s"), doubles({1, 2}), ints({3, 4})});
            }
            raw.block(30001, {ints({0})}).block(40000);
        }
        back = readHeaderFile(path, &status);
        ASSERT_TRUE(back) << status;
        EXPECT_EQ(back->timeAxis.type, kind);
        const GrdTimeValues* v = grdTimeAxisValues(back.get());
        EXPECT_EQ(v->unit, -1);
        EXPECT_STREQ(v->unitText.get(), "s");
        EXPECT_EQ(v->firstIndex, 4);
    }
}

TEST_F(StreamTest, UnknownTagsAreSkippedAndTraced) {
    TempDir dir;
    const std::string path = dir.file("unknown.grd");
    {
        RawFile raw(path);
        raw.block(10000).block(12345, {ints({1, 2, 3}), text("junk")}).block(10001, {text("title")});
        raw.start(1).block(29999).item().block(30006, {ints({8})}).block(31051, {ints({0})});
        raw.block(777).block(50000);
    }
    testing::internal::CaptureStdout();
    grdDebugOn(1);
    int32_t status = -1;
    HeaderPtr back = readHeaderFile(path, &status);
    grdDebugOn(0);
    const std::string out = testing::internal::GetCapturedStdout();
    ASSERT_TRUE(back) << status;
    EXPECT_STREQ(back->fileTitle.get(), "title");
    EXPECT_EQ(back->items[0].valueType, 8);
    EXPECT_NE(out.find("tag=12345"), std::string::npos);
    EXPECT_NE(out.find("tag=50000"), std::string::npos);
    EXPECT_NE(out.find("Unknown file tag found"), std::string::npos);
}

// A header that fails is destroyed: the reader gives null and the status.
TEST_F(StreamTest, TruncatedStreamsFail) {
    TempDir dir;
    const std::string path = dir.file("cut.grd");
    {
        RawFile raw(path);
        raw.start(1).item().block(31051, {ints({0})});  // no 40000 or 50000
    }
    int32_t status = -1;
    EXPECT_FALSE(readHeaderFile(path, &status));
    EXPECT_EQ(status, F_ERR_NOT_BLOCK);
    EXPECT_EQ(takeCodes().back(), F_ERR_NOT_BLOCK);

    // A data record where a block should start.
    {
        RawFile raw(path);
        raw.start(0).record(ints({1})).block(50000);
    }
    EXPECT_FALSE(readHeaderFile(path, &status));
    EXPECT_EQ(status, F_ERR_NOT_BLOCK);

    // Cut inside a block, at every length of a good stream.
    makeRichHeader();
    ASSERT_EQ(writeHeaderFile(path, header_), 0);
    const auto whole = readBytes(path);
    const std::string cut = dir.file("cut2.grd");
    for (size_t n = kAppBase; n + 4 < whole.size(); n += 23) {
        testutil::writeBytes(cut, std::vector<uint8_t>(whole.begin(), whole.begin() + static_cast<long>(n)));
        status = 0;
        EXPECT_FALSE(readHeaderFile(cut, &status)) << n;
        EXPECT_NE(status, 0) << n;
    }
    EXPECT_EQ(grdReadHeader(nullptr, &status), nullptr);
    EXPECT_EQ(status, F_ERR_ARGUMENT);
}

// Counts and lengths from the file are checked against what follows.
TEST_F(StreamTest, HostileCountsAreRefused) {
    TempDir dir;
    const std::string path = dir.file("hostile.grd");
    const auto expectRefused = [&](int32_t code, const char* what) {
        int32_t status = -1;
        EXPECT_FALSE(readHeaderFile(path, &status)) << what;
        EXPECT_EQ(status, code) << what;
        takeCodes();
    };
    // Each stream ends in an unknown block large enough that the item
    // counts of these files pass the check against the file's length.
    const auto file = [&](auto&& build) {
        RawFile raw(path);
        build(raw);
        raw.block(9999, {doublesN(40)}).block(50000);
    };

    file([](RawFile& r) { r.start(2000000000); });
    expectRefused(F_ERR_SIZE, "item count beyond the file");
    file([](RawFile& r) { r.start(-1); });
    expectRefused(F_ERR_SIZE, "negative item count");
    file([](RawFile& r) { r.start(3).item().block(31051, {ints({0})}); });
    expectRefused(F_ERR_DATA_TYPE, "fewer item blocks than the count");
    file([](RawFile& r) { r.start(1).item().block(31051, {ints({0})}).item().block(31051, {ints({0})}); });
    expectRefused(F_ERR_SIZE, "more item blocks than the count");
    file([](RawFile& r) { r.start(1).item(); });
    expectRefused(F_ERR_DATA_TYPE, "no axis block");
    file([](RawFile& r) { r.start(1).block(30005, {floats({1})}); });
    expectRefused(F_ERR_TYPE, "item block of the wrong type");
    file([](RawFile& r) { r.start(1).block(30005, {ints({1}), text("a"), ints({0})}); });
    expectRefused(F_ERR_READ, "item block cut short");
    file([](RawFile& r) { r.start(1).item().block(31056, {ints({0, 10, 2}), doublesN(10), doublesN(3)}); });
    expectRefused(F_ERR_SIZE, "NeqD2 with 10 boundaries for 10 cells");
    file([](RawFile& r) { r.start(1).item().block(31056, {ints({0, 10, 2}), doublesN(11)}); });
    expectRefused(F_ERR_READ, "NeqD2 without its y array");
    file([](RawFile& r) { r.start(1).item().block(31061, {ints({0, 2, 2}), doublesN(9), doublesN(8)}); });
    expectRefused(F_ERR_SIZE, "curvilinear y grid too short");
    file([](RawFile& r) { r.start(1).item().block(31053, {ints({0, 4}), floats({1, 2, 3})}); });
    expectRefused(F_ERR_SIZE, "NeqD1 points too few");
    file([](RawFile& r) { r.start(1).item().block(31053, {ints({0, 2000000000}), floats({1, 2, 3})}); });
    expectRefused(F_ERR_SIZE, "NeqD1 size beyond one record");
    file([](RawFile& r) { r.start(1).item().block(31055, {ints({0, -2, 3}), floats({0, 0, 1, 1})}); });
    expectRefused(F_ERR_SIZE, "negative size");
    file([](RawFile& r) { r.start(1).item().block(31060, {ints({0, 100000, 100000, 100000})}); });
    expectRefused(F_ERR_SIZE, "element count beyond 32 bits");
    file([](RawFile& r) { r.start(1).item().block(31055, {ints({0, 2, 3}), floats({0, 0, 1})}); });
    expectRefused(F_ERR_SIZE, "EqD2 with three floats");
    file([](RawFile& r) { r.start(1).item().block(31999); });
    expectRefused(F_ERR_DATA_TYPE, "unknown axis tag");
    file([](RawFile& r) {
        r.start(1, 2).item().block(31052, {ints({0, 4}), floats({1, 0})});
        r.block(30003, {doublesN(9 * 3)});
    });
    expectRefused(F_ERR_SIZE, "statistics of 3 elements for 4");
    file([](RawFile& r) {
        r.start(1).item().block(31051, {ints({0})}).block(30003, {floats({1, 2, 3, 4, 5, 6, 7, 8, 9})});
    });
    expectRefused(F_ERR_TYPE, "statistics as floats");
    file([](RawFile& r) { r.start(1).item().block(31051, {ints({0})}).block(30004, {ints({1})}); });
    expectRefused(F_ERR_TYPE, "associations as ints");
    file([](RawFile& r) { r.start(0).block(20051, {ints({0}), doubles({0, 1}), ints({-4, 0})}); });
    expectRefused(F_ERR_SIZE, "negative number of time steps");
    file([](RawFile& r) { r.start(0).block(20053, {text("2001-01-01"), ints({0})}); });
    expectRefused(F_ERR_TYPE, "calendar block without its time text");
    file([](RawFile& r) { r.start(0).block(10011, {text("UTM"), doubles({1, 2})}); });
    expectRefused(F_ERR_SIZE, "projection with two numbers");
    file([](RawFile& r) { r.start(0).block(10003, {ints({1, 2})}); });
    expectRefused(F_ERR_SIZE, "version of two ints");

    // A file of statistics type 2 without statistics blocks: they start
    // afresh for items the file could hold, and are refused for huge ones.
    file([](RawFile& r) { r.start(1, 2).item().block(31052, {ints({0, 4}), floats({1, 0})}); });
    int32_t status = -1;
    HeaderPtr back = readHeaderFile(path, &status);
    ASSERT_TRUE(back) << status;
    EXPECT_EQ(back->items[0].elemStatsCount, 4);
    EXPECT_EQ(back->items[0].globalMax, 1.0);  // the summary of the file is kept
    file([](RawFile& r) { r.start(1, 2).item().block(31057, {ints({0, 40000, 40000})}); });
    expectRefused(F_ERR_SIZE, "statistics for 1.6e9 elements of an empty file");
}

// A compressed file stores statistics per element of its key, whose length
// the header does not hold.
TEST_F(StreamTest, CompressedFileStatistics) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_ELEMENT);
    ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    ASSERT_EQ(grdSetItemAxisEqD2(info(1, "c"), 0, 4, 4, 0, 0, 1, 1), 0);
    const int32_t key[] = {0, 1, 2};
    ASSERT_EQ(grdSetEncodeKey(header_, key, key, key, 3), 0);
    TempDir dir;
    const std::string path = dir.file("compressed.grd");
    ASSERT_EQ(writeHeaderFile(path, header_), 0);
    int32_t status = -1;
    HeaderPtr back = readHeaderFile(path, &status);
    ASSERT_TRUE(back) << status;
    EXPECT_EQ(back->fileCompressed, 1);
    EXPECT_EQ(back->items[0].elemStatsCount, 3);
}

}  // namespace
