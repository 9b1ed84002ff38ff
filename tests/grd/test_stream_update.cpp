// In-place header updates: a full update gives the bytes of a fresh write
// of the changed header, texts keep their stored length, blocks whose size
// would change are left alone, the time update rewrites only the time block
// (older tags kept), the one-second throttle, foreign byte order, refusals.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "test_stream_support.h"

using grdtest::Codes;
using streamtest::doubles;
using streamtest::FilePtr;
using streamtest::HeaderPtr;
using streamtest::ints;
using streamtest::RawFile;
using streamtest::readHeaderFile;
using streamtest::text;
using testutil::readBytes;
using testutil::TempDir;

namespace {

constexpr size_t kRcfBase = 82;  // the stamp groups of a "GRD_" file start here
constexpr size_t kAppBase = 130;

class UpdateTest : public grdtest::GrdTest {
protected:
    ItemHandle info(int32_t n, const char* name) {
        ItemHandle item = grdItemD(header_, n);
        EXPECT_EQ(grdSetItemInfo(header_, item, QTY_ITEM_UNDEFINED, name, 0, RCF_FLOAT), 0);
        return item;
    }

    // Header A: titles, projection, an equidistant time axis, four items of
    // several axis kinds, per-element statistics and two custom blocks.
    void makeA() {
        makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 4, F_ITEM_STATS_ELEMENT);
        ASSERT_EQ(grdSetFileTitle(header_, "file A"), 0);
        ASSERT_EQ(grdSetAppTitle(header_, "app A"), 0);
        ASSERT_EQ(grdSetGeoInfoUTMProj(header_, "UTM-32N", 9.0, 54.0, 0.0), 0);
        ASSERT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 60.0, 0), 0);
        ASSERT_EQ(grdSetItemAxisEqD2(info(1, "depth"), 0, 3, 2, 0, 0, 1, 1), 0);
        const double x[] = {0, 1, 2}, y[] = {0, 5};
        ASSERT_EQ(grdSetItemAxisNeqD2(info(2, "speed"), 0, 2, 1, x, y, 0), 0);
        const double cx[] = {0, 1, 0, 1}, cy[] = {0, 0, 1, 1};
        ASSERT_EQ(grdSetItemAxisCurveLinearD2(info(3, "curve"), 0, 1, 1, cx, cy, 0), 0);
        const double p[] = {0, 1, 2};
        ASSERT_EQ(grdSetItemAxisNeqD1(info(4, "line"), 0, 2, p, 0), 0);
        ASSERT_EQ(grdSetAssocStatic(header_, 2, 1), 0);
        const int32_t data[] = {1, 2, 3};
        ASSERT_EQ(grdAddCustomBlock(header_, RCF_INT4, "ids", 3, data), 0);
        ASSERT_EQ(grdAddCustomBlock(header_, RCF_DOUBLE, "scale", 1, x), 0);
    }

    // Turns A into B: every field that an update rewrites changes, nothing
    // changes its size on disk.
    void changeToB() {
        ASSERT_EQ(grdSetFileTitle(header_, "file B"), 0);
        ASSERT_EQ(grdSetAppTitle(header_, "app B"), 0);
        ASSERT_EQ(grdSetAppVersionNo(header_, 99), 0);
        ASSERT_EQ(grdSetDataType(header_, 12), 0);
        ASSERT_EQ(grdSetDeleteValFloat(header_, 1.5f), 0);
        ASSERT_EQ(grdSetDeleteValDouble(header_, 2.5), 0);
        ASSERT_EQ(grdSetDeleteValByte(header_, 'z'), 0);
        ASSERT_EQ(grdSetDeleteValInt(header_, -9), 0);
        ASSERT_EQ(grdSetDeleteValUnsignedInt(header_, 77u), 0);
        ASSERT_EQ(grdUpdateGeoInfoUTMProj(header_, "UTM-33S", 15.0, -30.0, 2.0), 0);
        header_->timeAxis.time.timeSteps = 12;
        header_->timeAxis.time.start = 30.0;
        for (int32_t n = 1; n <= 4; ++n) {
            ItemHandle item = grdItemD(header_, n);
            const char* names[] = {"DEPTH", "SPEED", "CURVE", "LINE"};
            ASSERT_EQ(grdUpdateItemInfo(header_, item, QTY_ITEM_UNDEFINED, names[n - 1], 0), 0);
            ASSERT_EQ(grdSetItemValueType(item, n + 10), 0);
            ASSERT_EQ(grdSetItemRefCoords(item, 1.0f * n, 2, 3), 0);
            ASSERT_EQ(grdSetItemAxisOrientation(item, 0.5f, 0.25f, 0.125f), 0);
            item->globalMax = 50.0 + n;
            for (int32_t e = 0; e < item->elemStatsCount; ++e) item->elemStats[e].sum = 7.0 * e + n;
        }
        ASSERT_EQ(grdSetItemAxisEqD2(grdItemD(header_, 1), 0, 3, 2, -5, 5, 0.5f, 2), 0);
        const double x[] = {10, 11, 13}, y[] = {-1, 1};
        ASSERT_EQ(grdSetItemAxisNeqD2(grdItemD(header_, 2), 0, 2, 1, x, y, 0), 0);
        header_->items[2].coords[1][3] = 42.0;
        header_->items[3].coords[0][1] = 0.75;
        header_->items[3].coords[0][2] = 1.5;  // continues the spacing: the file holds no last boundary
        GrdCustomBlock* ids = header_->customBlocks.get();
        const int32_t newIds[] = {7, 8, 9};
        std::memcpy(ids->data.get(), newIds, sizeof(newIds));
    }

    // Creates path with the header stream and a dynamic section behind it;
    // the handle stays open (read-back mode) for updates.
    FilePtr create(const std::string& path) {
        FilePtr file(FOpenFileCreate(path.c_str(), 1));
        EXPECT_TRUE(file);
        EXPECT_EQ(grdWriteHeader(header_, file.get()), 0);
        rcfBlockWrite(kTagDynamicStart, file.get(), nullptr);
        LrecNode* step = rcfLrecNodeNew(RCF_DOUBLE, 2, nullptr, 1, nullptr);
        rcfBlockWrite(kTagTimeStep, file.get(), step);
        rcfLrecListFree(&step);
        return file;
    }

    // The bytes of a file without its two stamp groups (creation and edit
    // stamps depend on the clock).
    static std::vector<uint8_t> withoutStamps(const std::string& path) {
        std::vector<uint8_t> b = readBytes(path);
        if (b.size() >= kAppBase) std::fill(b.begin() + kRcfBase, b.begin() + kRcfBase + 40, 0);
        return b;
    }

    // The header on disk now (null, with the failure noted, when unreadable).
    static HeaderPtr reread(const std::string& path) {
        int32_t status = -1;
        HeaderPtr back = readHeaderFile(path, &status);
        EXPECT_TRUE(back) << status;
        return back;
    }

    // Makes the next update without force due: the last flush a while ago.
    static void longAgo(FileHandle file) { file->openClock = rcfClockMs() - 5000; }
};

TEST_F(UpdateTest, FullUpdateEqualsAFreshWrite) {
    makeA();
    TempDir dir;
    const std::string updated = dir.file("updated.grd");
    FilePtr file = create(updated);
    changeToB();
    // The update must flush the create handle itself; the bytes before it
    // are read from a copy flushed here.
    ASSERT_EQ(std::fflush(file->stream), 0);
    const auto before = readBytes(updated);
    ASSERT_EQ(grdUpdateHeader(header_, 1, file.get()), 0);
    file.reset();

    const std::string fresh = dir.file("fresh.grd");
    create(fresh).reset();
    EXPECT_EQ(withoutStamps(updated), withoutStamps(fresh));
    // Nothing but the edit stamp changes outside the header stream.
    const auto after = readBytes(updated);
    EXPECT_EQ(std::vector<uint8_t>(after.begin(), after.begin() + kRcfBase + 20),
              std::vector<uint8_t>(before.begin(), before.begin() + kRcfBase + 20));
    EXPECT_EQ(takeCodes(), Codes{});

    HeaderPtr back = reread(updated);
    ASSERT_TRUE(back);
    streamtest::expectSameHeader(*header_, *back);
}

TEST_F(UpdateTest, TextsKeepTheirStoredLength) {
    makeA();
    TempDir dir;
    const std::string path = dir.file("texts.grd");
    FilePtr file = create(path);
    ASSERT_EQ(grdSetFileTitle(header_, "B"), 0);
    ASSERT_EQ(grdSetAppTitle(header_, "a much longer title"), 0);
    ASSERT_TRUE(header_->items[0].name.assign("d"));
    header_->customBlocks->name.assign("idx");  // another name: the block stays as it was
    const int32_t data[] = {4, 5, 6};
    std::memcpy(header_->customBlocks->data.get(), data, sizeof(data));
    ASSERT_EQ(grdUpdateHeader(header_, 1, file.get()), 0);
    file.reset();
    HeaderPtr back = reread(path);
    ASSERT_TRUE(back);
    EXPECT_STREQ(back->fileTitle.get(), "B     ");
    EXPECT_STREQ(back->appTitle.get(), "a muc");
    EXPECT_STREQ(back->items[0].name.get(), "d    ");
    EXPECT_STREQ(back->customBlocks->name.get(), "ids");
    EXPECT_EQ(reinterpret_cast<const int32_t*>(back->customBlocks->data.get())[0], 1);
}

// A block whose size would change is never written over its neighbours.
TEST_F(UpdateTest, BlocksThatWouldChangeSizeAreLeftAsTheyAre) {
    makeA();
    TempDir dir;
    const std::string path = dir.file("sizes.grd");
    FilePtr file = create(path);
    ASSERT_EQ(grdSetItemAxisEqD2(grdItemD(header_, 1), 0, 4, 4, 0, 0, 1, 1), 0);  // 3 x 2 on disk
    ASSERT_EQ(grdSetItemAxisEqD1(grdItemD(header_, 3), 0, 4, 0, 1), 0);            // curvilinear on disk
    grdItemD(header_, 2)->unit = -1;                                                  // a key on disk
    grdItemD(header_, 2)->unitText.assign("knot");
    ASSERT_EQ(grdSetGeoInfoUndefined(header_), 0);
    const double scale[] = {1, 2};
    GrdCustomBlock* second = header_->customBlocks->next.get();
    second->count = 2;
    second->data = grdAllocArray<unsigned char>(16);
    std::memcpy(second->data.get(), scale, 16);
    ASSERT_EQ(grdSetAppVersionNo(header_, 5), 0);
    grdItemD(header_, 4)->valueType = 4;
    ASSERT_EQ(grdUpdateHeader(header_, 1, file.get()), 0);
    file.reset();

    HeaderPtr back = reread(path);
    ASSERT_TRUE(back);
    EXPECT_EQ(back->appVersionNo, 5);
    EXPECT_EQ(back->items[0].size[0], 3);
    EXPECT_EQ(back->items[2].axisType, F_CURVE_LINEAR_AXIS_D2);
    EXPECT_EQ(back->items[1].unit, 0);
    EXPECT_STREQ(back->items[1].name.get(), "speed");
    EXPECT_STREQ(back->projection.get(), "UTM-32N");
    EXPECT_EQ(back->customBlocks->next->count, 1);
    EXPECT_EQ(back->items[3].valueType, 4);
    EXPECT_EQ(streamtest::blockTags(path).back(), kTagTimeStep);
}

TEST_F(UpdateTest, TimeUpdateRewritesOnlyTheTimeBlock) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_GLOBAL);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 0), 0);
    info(1, "a");
    header_->timeAxis.time.start = 10.0;
    header_->timeAxis.time.timeSteps = 3;
    TempDir dir;
    const std::string path = dir.file("time.grd");
    FilePtr file = create(path);
    ASSERT_EQ(grdSetFileTitle(header_, "not written"), 0);
    header_->timeStepsDone = 7;
    header_->largestTime = 130.0;
    ASSERT_EQ(grdUpdateHeaderTime(header_, 1, file.get()), 0);
    EXPECT_EQ(header_->timeAxis.time.timeSteps, 7);
    EXPECT_EQ(header_->timeAxis.time.step, 120.0);
    // Fewer steps done than stored: the stored number stays.
    header_->timeStepsDone = 2;
    ASSERT_EQ(grdUpdateHeaderTime(header_, 1, file.get()), 0);
    file.reset();
    HeaderPtr back = reread(path);
    ASSERT_TRUE(back);
    EXPECT_EQ(back->timeAxis.time.timeSteps, 7);
    EXPECT_EQ(back->timeAxis.time.step, 120.0);
    EXPECT_STREQ(back->fileTitle.get(), "file");

    // A header whose time axis is of another kind than the file's: 2010.
    int32_t status = -1;
    file.reset(FOpenFileEdit(path.c_str(), &status));
    ASSERT_TRUE(file);
    header_->timeAxis.type = F_CAL_NEQ_AXIS;
    EXPECT_EQ(grdUpdateHeaderTime(header_, 1, file.get()), F_ERR_VALUE);
    EXPECT_EQ(grdUpdateHeader(header_, 1, file.get()), F_ERR_VALUE);
}

TEST_F(UpdateTest, OlderTimeTagsKeepTheirForm) {
    TempDir dir;
    const std::string path = dir.file("older.grd");
    {
        RawFile raw(path);
        raw.block(10000).block(10005, {ints({1})}).block(20000);
        raw.block(20002, {text("minutes"), doubles({0.0, 5.0}), ints({2, 0})});
        raw.block(30000).block(30001, {ints({1})}).item().block(31001).block(50000);
    }
    int32_t status = -1;
    FilePtr file(FOpenFileEdit(path.c_str(), &status));
    ASSERT_TRUE(file);
    HeaderPtr header(grdReadHeader(file.get(), &status));
    ASSERT_TRUE(header) << status;
    header->timeStepsDone = 4;
    header->largestTime = 45.0;
    header->items[0].valueType = 3;  // the file has no 30006 for it
    ASSERT_EQ(grdUpdateHeader(header.get(), 1, file.get()), 0);
    file.reset();
    const std::vector<int32_t> tags = streamtest::blockTags(path);
    EXPECT_EQ(tags, (std::vector<int32_t>{10000, 10005, 20000, 20002, 30000, 30001, 30005, 31001, 50000}));
    HeaderPtr back = reread(path);
    ASSERT_TRUE(back);
    EXPECT_STREQ(back->timeAxis.time.unitText.get(), "minutes");
    EXPECT_EQ(back->timeAxis.time.timeSteps, 4);
    EXPECT_EQ(back->timeAxis.time.step, 45.0);
    EXPECT_EQ(back->items[0].valueType, 0);
}

TEST_F(UpdateTest, WithoutForceAtMostOnceASecond) {
    makeA();
    TempDir dir;
    const std::string path = dir.file("throttle.grd");
    FilePtr file = create(path);
    const auto appVersionOnDisk = [&] {
        HeaderPtr back = reread(path);
        return back ? back->appVersionNo : -1;
    };
    ASSERT_EQ(std::fflush(file->stream), 0);  // so that the file can be read beside the handle
    // Just created: the file's last flush is now.
    ASSERT_EQ(grdSetAppVersionNo(header_, 10), 0);
    EXPECT_EQ(grdUpdateHeader(header_, 0, file.get()), 0);
    EXPECT_EQ(appVersionOnDisk(), 3);

    longAgo(file.get());
    EXPECT_EQ(grdUpdateHeader(header_, 0, file.get()), 0);
    EXPECT_EQ(appVersionOnDisk(), 10);
    ASSERT_EQ(grdSetAppVersionNo(header_, 11), 0);
    EXPECT_EQ(grdUpdateHeader(header_, 0, file.get()), 0);  // within the second: nothing written
    EXPECT_EQ(appVersionOnDisk(), 10);
    EXPECT_EQ(grdUpdateHeader(header_, 1, file.get()), 0);
    EXPECT_EQ(appVersionOnDisk(), 11);

    // The time update shares the clock.
    header_->timeStepsDone = 20;
    EXPECT_EQ(grdUpdateHeaderTime(header_, 0, file.get()), 0);
    longAgo(file.get());
    EXPECT_EQ(grdUpdateHeaderTime(header_, 0, file.get()), 0);
    header_->timeStepsDone = 30;
    EXPECT_EQ(grdUpdateHeaderTime(header_, 0, file.get()), 0);
    file.reset();
    HeaderPtr back = reread(path);
    ASSERT_TRUE(back);
    EXPECT_EQ(back->timeAxis.time.timeSteps, 20);
}

TEST_F(UpdateTest, ForeignByteOrderUpdatesInPlace) {
    makeA();
    TempDir dir;
    const std::string host = dir.file("host.grd");
    create(host).reset();
    const std::string swapped = dir.file("swapped.grd");
    testutil::writeBytes(swapped, streamtest::swapRecordFile(readBytes(host)));

    int32_t status = -1;
    FilePtr file(FOpenFileEdit(swapped.c_str(), &status));
    ASSERT_TRUE(file);
    ASSERT_EQ(file->swapBytes, 1u);
    HeaderPtr header(grdReadHeader(file.get(), &status));
    ASSERT_TRUE(header) << status;
    GrdHeader* h = header.get();
    std::swap(header_, h);  // changeToB works on the fixture's header
    changeToB();
    std::swap(header_, h);
    ASSERT_EQ(grdUpdateHeader(h, 1, file.get()), 0);
    file.reset();

    // Back in host order it is a fresh write of B.
    const std::string back = dir.file("back.grd");
    testutil::writeBytes(back, streamtest::swapRecordFile(readBytes(swapped)));
    changeToB();
    const std::string fresh = dir.file("fresh.grd");
    create(fresh).reset();
    std::vector<uint8_t> a = withoutStamps(back), b = withoutStamps(fresh);
    // The NeqD1 item of a header read from the file keeps its points'
    // y and z (here 0, as in the fresh write).
    EXPECT_EQ(a, b);
}

TEST_F(UpdateTest, RefusalsAndTraces) {
    makeA();
    TempDir dir;
    const std::string path = dir.file("refusals.grd");
    create(path).reset();
    int32_t status = -1;
    FilePtr file(FOpenFileRead(path.c_str(), &status));
    ASSERT_TRUE(file);
    EXPECT_EQ(grdUpdateHeader(header_, 1, file.get()), F_ERR_READONLY);
    EXPECT_EQ(grdUpdateHeaderTime(header_, 1, file.get()), F_ERR_READONLY);
    EXPECT_EQ(grdUpdateHeader(nullptr, 1, file.get()), F_ERR_ARGUMENT);
    EXPECT_EQ(grdUpdateHeaderTime(header_, 1, nullptr), F_ERR_ARGUMENT);
    EXPECT_EQ(takeCodes(), (Codes{F_ERR_READONLY, F_ERR_READONLY, F_ERR_ARGUMENT, F_ERR_ARGUMENT}));

    file.reset(FOpenFileEdit(path.c_str(), &status));
    ASSERT_TRUE(file);
    testing::internal::CaptureStdout();
    grdDebugOn(1);
    EXPECT_EQ(grdUpdateHeader(header_, 1, file.get()), 0);
    grdDebugOn(0);
    const std::string out = testing::internal::GetCapturedStdout();
    EXPECT_NE(out.find("while_loop starts here"), std::string::npos);
    EXPECT_NE(out.find("Unknown tag found 30001"), std::string::npos);
    EXPECT_NE(out.find("ends here"), std::string::npos);

    // A stream without a data section ends the scan at the end of the file.
    {
        RawFile raw(path);
        raw.block(10000).block(10003, {ints({1})});
    }
    file.reset(FOpenFileEdit(path.c_str(), &status));
    ASSERT_TRUE(file);
    testing::internal::CaptureStdout();
    grdDebugOn(1);
    EXPECT_EQ(grdUpdateHeader(header_, 1, file.get()), 0);
    grdDebugOn(0);
    EXPECT_NE(testing::internal::GetCapturedStdout().find("Zero tag found, end of file, corrupt file"),
              std::string::npos);
}

}  // namespace
