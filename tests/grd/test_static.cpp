// Static items: the item object and its refusals, writing and reading back
// in file order (values, info, axes), the section states, and unit
// conversion on write (on a private copy) and on read.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <vector>

#include "common/testutil.h"
#include "test_lifecycle_support.h"

using namespace grdtest;

namespace {

class StaticTest : public FileTest {};

TEST_F(StaticTest, ItemObjectAndRefusals) {
    StaticItem item;
    ASSERT_TRUE(item);
    EXPECT_EQ(grdItemS(item.get()), item.get());
    EXPECT_EQ(item.get()->isStatic, 1);
    EXPECT_EQ(item.get()->axisType, 0);

    // Null handles and pointers.
    EXPECT_EQ(grdStaticCreate(nullptr), 1000);
    EXPECT_EQ(grdStaticDestroy(nullptr), 1000);
    ItemHandle none = nullptr;
    EXPECT_EQ(grdStaticDestroy(&none), 1000);
    EXPECT_EQ(grdStaticSetHeader(nullptr, item.get()), 1000);
    EXPECT_EQ(grdStaticGetData(nullptr, nullptr), 1000);
    EXPECT_EQ(grdStaticGetData(item.get(), nullptr), 2010);
    EXPECT_EQ(grdStaticWrite(item.get(), nullptr, nullptr), 1000);
    int32_t status = -1;
    EXPECT_EQ(grdStaticRead(nullptr, &status), nullptr);
    EXPECT_EQ(status, 1000);
    EXPECT_EQ(grdStaticSkip(nullptr), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000, 1000, 1000, 2010, 1000, 1000, 1000}));

    // An item of a header is no static item: never freed, never written.
    makeHeader();
    ItemHandle headerItem = grdItemD(header_, 1);
    ItemHandle alias = headerItem;
    EXPECT_EQ(grdStaticDestroy(&alias), 1000);
    EXPECT_EQ(alias, headerItem);
    EXPECT_EQ(grdStaticSetHeader(header_, headerItem), 1000);
    float buffer[1] = {};
    EXPECT_EQ(grdStaticGetData(headerItem, buffer), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000}));

    // Destroy clears the caller's handle.
    ItemHandle other = nullptr;
    ASSERT_EQ(grdStaticCreate(&other), 0);
    EXPECT_EQ(grdStaticDestroy(&other), 0);
    EXPECT_EQ(other, nullptr);
}

TEST_F(StaticTest, SetHeaderKeepsTheFirstLink) {
    HeaderHandle first = makeHeader();
    HeaderHandle second = nullptr;
    ASSERT_EQ(grdHeaderCreate(1, "other", "app", 1, 1, 1, &second), 0);
    StaticItem item;
    EXPECT_EQ(grdStaticSetHeader(first, item.get()), 0);
    EXPECT_EQ(grdStaticSetHeader(second, item.get()), 0);
    EXPECT_EQ(grdAsStatic(item.get())->header, first);
    grdHeaderDestroy(&second);
}

TEST_F(StaticTest, ItemsComeBackInOrderWithInfoAxesAndValues) {
    makeFileHeader();
    const std::string path = dir_.file("static.grd");
    create(path);
    EXPECT_EQ(file_->ownerMark, 1u);

    const std::vector<float> grid = {1.5f, 2.5f, -3.0f, 4.0f, 5.0f, 6.25f};  // 3 x 2
    const std::vector<double> xs = {0.0, 1.0, 3.0, 7.0}, ys = {-1.0, 1.0};  // NeqD2 of 3 x 1: boundaries
    const std::vector<double> line = {10.0, 20.0, 30.0};
    const int32_t scalar[1] = {42};
    {
        StaticItem a, b, c;
        describe(header_, a.get(), "grid", QTY_ITEM_UNDEFINED, 0, RCF_FLOAT,
                 [](ItemHandle i) { return grdSetItemAxisEqD2(i, 0, 3, 2, 0.5f, 1.5f, 10.0f, 20.0f); });
        describe(header_, b.get(), "line", QTY_ITEM_UNDEFINED, 0, RCF_DOUBLE,
                 [&](ItemHandle i) { return grdSetItemAxisNeqD2(i, 0, 3, 1, xs.data(), ys.data(), 0); });
        describe(header_, c.get(), "scalar", QTY_ITEM_UNDEFINED, 0, RCF_INT4, [](ItemHandle) { return 0; });
        EXPECT_EQ(grdSetItemValueType(a.get(), 7), 0);
        EXPECT_EQ(grdStaticWrite(a.get(), file_, grid.data()), 0);
        EXPECT_EQ(file_->ownerMark, 2u);
        EXPECT_EQ(grdStaticWrite(b.get(), file_, line.data()), 0);
        EXPECT_EQ(grdStaticWrite(c.get(), file_, scalar), 0);
        EXPECT_EQ(file_->ownerMark, 2u);
    }
    close();
    EXPECT_EQ(staticNames(path), (std::vector<std::string>{"grid", "line", "scalar"}));

    openRead(path);
    int32_t status = -1;
    StaticItem a(grdStaticRead(file_, &status));
    ASSERT_TRUE(a);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(file_->ownerMark, 2u);
    const char* name = nullptr;
    int32_t dataType = 0, valueType = 0;
    grdGetItemInfo_(a.get(), nullptr, &name, nullptr, &dataType);
    EXPECT_STREQ(name, "grid");
    EXPECT_EQ(dataType, RCF_FLOAT);
    EXPECT_EQ(grdGetItemValueType(a.get(), &valueType), 0);
    EXPECT_EQ(valueType, 7);
    int32_t nx = 0, ny = 0;
    float x0 = 0, y0 = 0, dx = 0, dy = 0;
    ASSERT_EQ(grdGetItemAxisEqD2(a.get(), nullptr, nullptr, &nx, &ny, &x0, &y0, &dx, &dy), 0);
    EXPECT_EQ(nx, 3);
    EXPECT_EQ(ny, 2);
    EXPECT_FLOAT_EQ(x0, 0.5f);
    EXPECT_FLOAT_EQ(dy, 20.0f);
    std::vector<float> gridBack(6);
    EXPECT_EQ(grdStaticGetData(a.get(), gridBack.data()), 0);
    EXPECT_EQ(gridBack, grid);

    StaticItem b(grdStaticRead(file_, &status));
    ASSERT_TRUE(b);
    const double *xBack = nullptr, *yBack = nullptr;
    ASSERT_EQ(grdGetItemAxisNeqD2(b.get(), nullptr, nullptr, &nx, &ny, &xBack, &yBack), 0);
    ASSERT_EQ(nx, 3);
    ASSERT_EQ(ny, 1);
    EXPECT_EQ(std::vector<double>(xBack, xBack + 4), xs);
    EXPECT_EQ(std::vector<double>(yBack, yBack + 2), ys);
    std::vector<double> lineBack(3);
    EXPECT_EQ(grdStaticGetData(b.get(), lineBack.data()), 0);
    EXPECT_EQ(lineBack, line);

    // Skipping passes the third; then the static part is over.
    EXPECT_EQ(grdStaticSkip(file_), 0);
    EXPECT_EQ(grdStaticRead(file_, &status), nullptr);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(grdStaticSkip(file_), 0);
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(StaticTest, FileWithoutStaticItemsReadsNone) {
    makeFileHeader();
    const std::string path = dir_.file("empty.grd");
    create(path);
    close();
    openRead(path);
    int32_t status = -1;
    EXPECT_EQ(grdStaticRead(file_, &status), nullptr);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(grdStaticRead(file_, nullptr), nullptr);
    EXPECT_EQ(grdStaticSkip(file_), 0);
    EXPECT_EQ(file_->error, 0);  // the end of file met by the look-ahead is not left pending
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(StaticTest, RefusedItemsLeaveTheFileAsItWas) {
    makeFileHeader();
    const std::string path = dir_.file("refused.grd");
    create(path);
    ASSERT_EQ(std::fflush(file_->stream), 0);
    const auto size = std::filesystem::file_size(path);

    StaticItem undefined;  // no info: no axis, no data type
    EXPECT_EQ(grdStaticWrite(undefined.get(), file_, &size), 2010);
    StaticItem tvar;
    describe(header_, tvar.get(), "tvar", QTY_ITEM_UNDEFINED, 0, RCF_FLOAT,
             [](ItemHandle i) { return grdSetItemAxisTvarD1(i, 0, 4); });
    const float values[4] = {};
    EXPECT_EQ(grdStaticWrite(tvar.get(), file_, values), 2010);
    StaticItem noValues;
    describe(header_, noValues.get(), "none", QTY_ITEM_UNDEFINED, 0, RCF_FLOAT,
             [](ItemHandle i) { return grdSetItemAxisEqD1(i, 0, 4, 0.0f, 1.0f); });
    EXPECT_EQ(grdStaticWrite(noValues.get(), file_, nullptr), 1000);
    EXPECT_EQ(grdStaticWrite(grdItemD(header_, 1), file_, values), 1000);  // a header's item
    EXPECT_EQ(takeCodes(), (Codes{2010, 2010, 1000, 1000}));

    ASSERT_EQ(std::fflush(file_->stream), 0);
    EXPECT_EQ(std::filesystem::file_size(path), size);
    EXPECT_EQ(file_->ownerMark, 1u);
}

TEST_F(StaticTest, StaticItemsCannotFollowDynamicData) {
    makeFileHeader();
    const std::string path = dir_.file("dynamic.grd");
    create(path);
    StaticItem early;
    describeScalar(early.get(), "early");
    const float one = 1.0f;
    ASSERT_EQ(grdStaticWrite(early.get(), file_, &one), 0);
    // The dynamic section begins (what the time-step writer does first).
    ASSERT_EQ(grdCheckWriteLB(header_, kTagDynamicStart, nullptr, file_, "test", 0), 0);
    file_->ownerMark = 3;
    StaticItem item;
    describe(header_, item.get(), "late", QTY_ITEM_UNDEFINED, 0, RCF_FLOAT,
             [](ItemHandle i) { return grdSetItemAxisEqD1(i, 0, 2, 0.0f, 1.0f); });
    const float values[2] = {1, 2};
    EXPECT_EQ(grdStaticWrite(item.get(), file_, values), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});
    close();

    // Reading: the static items end where the dynamic data begins, and the
    // file then stands inside it; skipping there changes nothing.
    openRead(path);
    int32_t status = -1;
    StaticItem first(grdStaticRead(file_, &status));
    EXPECT_TRUE(first);
    EXPECT_EQ(grdStaticRead(file_, &status), nullptr);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(file_->ownerMark, 3u);
    const int64_t at = rcfTell64(file_);
    EXPECT_EQ(grdStaticSkip(file_), 0);
    EXPECT_EQ(rcfTell64(file_), at);
    EXPECT_EQ(file_->ownerMark, 3u);
}

// A value block that does not match its item record is refused before
// anything is allocated for it, and nothing leaks.
TEST_F(StaticTest, MismatchedValueBlocksAreRefused) {
    makeFileHeader();
    const std::string path = dir_.file("hostile.grd");
    create(path);
    StaticItem item;
    describe(header_, item.get(), "four", QTY_ITEM_UNDEFINED, 0, RCF_FLOAT,
             [](ItemHandle i) { return grdSetItemAxisEqD1(i, 0, 4, 0.0f, 1.0f); });
    const float values[4] = {1, 2, 3, 4};
    ASSERT_EQ(grdStaticWrite(item.get(), file_, values), 0);
    close();
    const std::vector<uint8_t> good = testutil::readBytes(path);
    // The 40001 block: 0xFE, the tag, then the value record (type, count, values), 0xFF.
    const uint8_t mark[3] = {0xFE, kTagStaticData & 0xFF, kTagStaticData >> 8};
    size_t at = 0;
    for (size_t i = 0; i + 3 <= good.size(); ++i)
        if (std::memcmp(&good[i], mark, 3) == 0) at = i;
    ASSERT_GT(at, 0u);
    ASSERT_EQ(good[at + 3], RCF_FLOAT);

    struct Case {
        size_t offset;
        std::vector<uint8_t> patch;
        int32_t code;
    } cases[] = {
        {at + 4, {0xFF, 0xFF, 0xFF, 0x7F}, 2013},  // a count far beyond the item's 4 elements
        {at + 4, {3, 0, 0, 0}, 2013},              // one too few
        {at + 3, {RCF_INT4}, 2009},                // another type
        {at + 1, {0x42}, 2019},                    // not a value block
    };
    for (const Case& c : cases) {
        std::vector<uint8_t> bytes = good;
        std::copy(c.patch.begin(), c.patch.end(), bytes.begin() + static_cast<std::ptrdiff_t>(c.offset));
        testutil::writeBytes(path, bytes);
        openRead(path);
        int32_t status = 0;
        EXPECT_EQ(grdStaticRead(file_, &status), nullptr);
        EXPECT_EQ(status, c.code);
        close();
    }
    // Cut inside the values.
    testutil::writeBytes(path, std::vector<uint8_t>(good.begin(), good.begin() + static_cast<std::ptrdiff_t>(at + 12)));
    openRead(path);
    int32_t status = 0;
    EXPECT_EQ(grdStaticRead(file_, &status), nullptr);
    EXPECT_NE(status, 0);
    close();
}

// Unit conversion: values given in feet are stored in metres (mode 2), from
// the user unit (mode 1), from the first unit of the sequence (mode 3); the
// caller's array is never changed and delete values pass unconverted.
TEST_F(StaticTest, UnitConversionOnWriteAndRead) {
    const int32_t metre = unitTag("m");
    const int32_t foot = unitTag("ft");
    ASSERT_EQ(unitOf(40101, 1), metre);
    HeaderHandle h = makeFileHeader();
    ASSERT_EQ(grdSetDeleteValFloat(h, -99.0f), 0);
    const std::string path = dir_.file("units.grd");
    create(path);

    const std::vector<float> feet = {1.0f, -99.0f, 10.0f};
    const std::vector<double> feetD = {2.0, 4.0};
    const std::vector<float> metres = {0.3048f, 3.048f};
    ASSERT_NE(qtySetUserUnit(40101, foot), 0);
    struct Case {
        const char* name;
        int32_t unit, dataType, mode, convUnit, n;
        const void* values;
    } cases[] = {
        {"mode2", metre, RCF_FLOAT, 2, foot, 3, feet.data()},   // from the alternative unit
        {"mode1", metre, RCF_DOUBLE, 1, 0, 2, feetD.data()},    // from the user unit
        {"mode3", foot, RCF_FLOAT, 3, 0, 2, metres.data()},     // from the first unit (metre)
    };
    for (const Case& c : cases) {
        StaticItem item;
        describe(h, item.get(), c.name, 40101, c.unit, c.dataType,
                 [&c](ItemHandle i) { return grdSetItemAxisEqD1(i, 0, c.n, 0.0f, 1.0f); });
        ASSERT_EQ(grdStaticSetHeader(h, item.get()), 0);
        ASSERT_EQ(grdSetItemUnitConversion(item.get(), c.mode, c.convUnit), 0);
        EXPECT_EQ(grdStaticWrite(item.get(), file_, c.values), 0);
    }
    EXPECT_EQ(feet, (std::vector<float>{1.0f, -99.0f, 10.0f}));
    EXPECT_EQ(feetD, (std::vector<double>{2.0, 4.0}));
    close();

    openRead(path);
    StaticItem m2(grdStaticRead(file_, nullptr)), m1(grdStaticRead(file_, nullptr)), m3(grdStaticRead(file_, nullptr));
    ASSERT_TRUE(m2 && m1 && m3);
    // As stored: converted, the delete value of the linked header kept.
    std::vector<float> f(3);
    ASSERT_EQ(grdStaticGetData(m2.get(), f.data()), 0);
    EXPECT_FLOAT_EQ(f[0], 0.3048f);
    EXPECT_FLOAT_EQ(f[1], -99.0f);
    EXPECT_FLOAT_EQ(f[2], 3.048f);
    std::vector<double> d(2);
    ASSERT_EQ(grdStaticGetData(m1.get(), d.data()), 0);
    EXPECT_DOUBLE_EQ(d[0], 0.6096);
    EXPECT_DOUBLE_EQ(d[1], 1.2192);
    std::vector<float> g(2);
    ASSERT_EQ(grdStaticGetData(m3.get(), g.data()), 0);
    EXPECT_NEAR(g[0], 1.0f, 1e-6);
    EXPECT_NEAR(g[1], 10.0f, 1e-5);

    // Read back into the caller's unit by each mode; the item's own values stay.
    ASSERT_EQ(grdStaticSetHeader(header_, m2.get()), 0);
    ASSERT_EQ(grdSetItemUnitConversion(m2.get(), 2, foot), 0);
    ASSERT_EQ(grdStaticGetData(m2.get(), f.data()), 0);
    EXPECT_NEAR(f[0], 1.0f, 1e-6);
    EXPECT_FLOAT_EQ(f[1], -99.0f);
    EXPECT_NEAR(f[2], 10.0f, 1e-5);
    ASSERT_EQ(grdStaticGetData(m2.get(), f.data()), 0);  // converted afresh each time
    EXPECT_NEAR(f[0], 1.0f, 1e-6);
    ASSERT_EQ(grdSetItemUnitConversion(m1.get(), 1, 0), 0);
    ASSERT_EQ(grdStaticGetData(m1.get(), d.data()), 0);
    EXPECT_NEAR(d[0], 2.0, 1e-12);
    EXPECT_NEAR(d[1], 4.0, 1e-12);
    ASSERT_EQ(grdSetItemUnitConversion(m3.get(), 3, 0), 0);
    ASSERT_EQ(grdStaticGetData(m3.get(), g.data()), 0);
    EXPECT_NEAR(g[0], 0.3048f, 1e-6);
    EXPECT_NEAR(g[1], 3.048f, 1e-5);
    qtySetUserUnit(40101, metre);
    EXPECT_EQ(takeCodes(), Codes{});
}

}  // namespace
