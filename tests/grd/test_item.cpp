// Items: access, identity with units from the unit library, settings,
// reference coordinates and their conversion modes, element counts of
// compressed headers, static associations and encoding keys.
#include <cmath>
#include <cstring>
#include <string>

#include "test_header_support.h"

namespace {

using grdtest::Codes;
using grdtest::convert;
using grdtest::GrdTest;
using grdtest::unitOf;

class Item : public GrdTest {};

constexpr int32_t kLength = QTY_ITEM_GEOMETRY_1D;  // a quantity measured in lengths

TEST_F(Item, AccessByNumberAndStaticItems) {
    HeaderHandle h = makeHeader(1, 3);
    EXPECT_EQ(grdItemD(h, 1), &h->items[0]);
    EXPECT_EQ(grdItemD(h, 3), &h->items[2]);
    EXPECT_EQ(grdItemD(h, 0), nullptr);
    EXPECT_EQ(grdItemD(h, 4), nullptr);
    EXPECT_EQ(grdItemD(nullptr, 1), nullptr);
    EXPECT_EQ(takeCodes(), (Codes{2007, 2007, 1000}));
    GrdItem staticItem;
    staticItem.isStatic = 1;
    EXPECT_EQ(grdItemS(&staticItem), &staticItem);
    EXPECT_EQ(grdItemS(nullptr), nullptr);
    EXPECT_EQ(takeCodes(), Codes{1000});
}

TEST_F(Item, InfoTakesOnlyUnitsOfTheQuantityType) {
    HeaderHandle h = makeHeader();
    ItemHandle item = grdItemD(h, 1);
    const int32_t meter = unitOf(kLength, 1);
    ASSERT_NE(meter, 0);
    ASSERT_FALSE(qtyItemUnitEqv(kLength, QTY_UNIT_SECOND));

    ASSERT_EQ(grdSetItemInfo(h, item, kLength, "depth", meter, 1), 0);
    EXPECT_EQ(grdSetItemInfo(h, item, kLength, "other", QTY_UNIT_SECOND, 2), 2020);
    EXPECT_TRUE(takeCodes().empty());  // 2020 has a slot that no handler can be set for
    int32_t type = 0, unit = 0, dataType = 0;
    const char *typeText = nullptr, *name = nullptr, *unitText = nullptr;
    ASSERT_EQ(grdGetItemInfo(item, &type, &typeText, &name, &unit, &unitText, &dataType), 0);
    EXPECT_EQ(type, kLength);
    EXPECT_STREQ(name, "depth");  // unchanged by the refused call
    EXPECT_EQ(unit, meter);
    EXPECT_EQ(dataType, 1);
    const char* expected = nullptr;
    ASSERT_TRUE(qtyGetItemTypeKey(kLength, &expected));
    EXPECT_STREQ(typeText, expected);
    ASSERT_TRUE(qtyGetUnitKey(meter, &expected));
    EXPECT_STREQ(unitText, expected);
    EXPECT_EQ(grdGetItemAxisType(item), F_EQ_AXIS_D0);
    EXPECT_EQ(item->owner, h);

    // Null checks come item first, then header.
    EXPECT_EQ(grdSetItemInfo(h, nullptr, kLength, "x", meter, 1), 1000);
    EXPECT_EQ(grdSetItemInfo(nullptr, item, kLength, "x", meter, 1), 1000);
    EXPECT_EQ(grdGetItemInfo(nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000}));
}

TEST_F(Item, InfoResetsTheItemButKeepsStaticFlagAndFreesOwnArrays) {
    HeaderHandle h = makeHeader();
    ItemHandle item = makeItem();
    const double x[3] = {0, 1, 2}, y[2] = {5, 6};
    ASSERT_EQ(grdSetItemAxisNeqD2(item, 0, 2, 1, x, y, 0), 0);
    ASSERT_EQ(grdSetItemUnitConversion(item, 2, 7), 0);
    ASSERT_EQ(grdSetItemAxisOrientation(item, 1, 2, 3), 0);
    ASSERT_EQ(grdSetItemValueType(item, 3), 0);
    h->deleteValFloat = 99.0f;

    ASSERT_EQ(grdSetItemInfo(h, item, QTY_ITEM_UNDEFINED, "again", 0, 4), 0);
    EXPECT_EQ(grdGetItemAxisType(item), F_EQ_AXIS_D0);
    EXPECT_EQ(item->coords[0], nullptr);
    EXPECT_EQ(item->coords[1], nullptr);
    int32_t mode = -1, unit = -1, valueType = -1;
    grdGetItemUnitConversion(item, &mode, &unit);
    grdGetItemValueType(item, &valueType);
    EXPECT_EQ(mode, 0);
    EXPECT_EQ(unit, 0);
    EXPECT_EQ(valueType, 0);
    // The reset uses the constant -1e-35, not the header's float delete value.
    float alpha = 0, refX = 0;
    grdGetItemAxisOrientation(item, &alpha, nullptr, nullptr);
    grdGetItemRefCoords(item, &refX, nullptr, nullptr);
    EXPECT_EQ(alpha, F_DELETE_VALUE_FLOAT);
    EXPECT_EQ(refX, F_DELETE_VALUE_FLOAT);
    const char* unitText = reinterpret_cast<const char*>(0x1);
    grdGetItemInfo_(item, nullptr, nullptr, &unitText, nullptr);
    EXPECT_EQ(unitText, nullptr);  // stored as it is: freed by the reset

    GrdItem staticItem;
    grdItemInit(&staticItem, F_DELETE_VALUE_FLOAT);
    staticItem.isStatic = 1;
    ASSERT_EQ(grdSetItemInfo(h, &staticItem, QTY_ITEM_UNDEFINED, "static", 0, 4), 0);
    EXPECT_EQ(staticItem.isStatic, 1);
    EXPECT_EQ(staticItem.owner, h);
}

TEST_F(Item, InfoByUnitTextStoresTheTextWithoutTesting) {
    HeaderHandle h = makeHeader();
    ItemHandle item = grdItemD(h, 1);
    ASSERT_EQ(grdSetItemInfo_(h, item, kLength, "level", "no such unit", 2), 0);
    int32_t type = 0, dataType = 0;
    const char *name = nullptr, *unitText = nullptr;
    ASSERT_EQ(grdGetItemInfo_(item, &type, &name, &unitText, &dataType), 0);
    EXPECT_EQ(type, kLength);
    EXPECT_STREQ(name, "level");
    EXPECT_STREQ(unitText, "no such unit");
    EXPECT_EQ(dataType, 2);
    EXPECT_EQ(item->unit, 0);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Item, InfoGetterFallsBackToTheStoredUnitTextAndLooksUpItsKey) {
    HeaderHandle h = makeHeader();
    ItemHandle item = grdItemD(h, 1);
    const int32_t meter = unitOf(kLength, 1);
    const char* meterText = nullptr;
    ASSERT_TRUE(qtyGetUnitKey(meter, &meterText));
    ASSERT_EQ(grdSetItemInfo_(h, item, kLength, "level", meterText, 1), 0);
    item->unit = -1;  // as for an item of an older file: only the text is known
    int32_t unit = 0;
    const char* unitText = nullptr;
    ASSERT_EQ(grdGetItemInfo(item, nullptr, nullptr, nullptr, &unit, &unitText, nullptr), 0);
    EXPECT_STREQ(unitText, meterText);
    EXPECT_EQ(unit, meter);
    // Without a stored text and a key the library knows: "".
    item->unitText.reset();
    ASSERT_EQ(grdGetItemInfo(item, nullptr, nullptr, nullptr, &unit, &unitText, nullptr), 0);
    EXPECT_STREQ(unitText, "");
    EXPECT_EQ(unit, -1);
}

TEST_F(Item, UpdateInfoKeepsTheStoredNameLength) {
    HeaderHandle h = makeHeader();
    ItemHandle item = grdItemD(h, 1);
    const int32_t meter = unitOf(kLength, 1), second = unitOf(kLength, 2);
    ASSERT_NE(second, 0);
    ASSERT_EQ(grdSetItemInfo_(h, item, kLength, "depth", "text", 1), 0);
    ASSERT_EQ(grdUpdateItemInfo(h, item, kLength, "abc", second), 0);
    const char* name = nullptr;
    const char* unitText = reinterpret_cast<const char*>(0x1);
    grdGetItemInfo_(item, nullptr, &name, &unitText, nullptr);
    EXPECT_STREQ(name, "abc  ");
    EXPECT_EQ(unitText, nullptr);
    EXPECT_EQ(item->unit, second);
    ASSERT_EQ(grdUpdateItemInfo(h, item, kLength, "a much longer name", meter), 0);
    grdGetItemInfo_(item, nullptr, &name, nullptr, nullptr);
    EXPECT_STREQ(name, "a muc");
    EXPECT_EQ(grdUpdateItemInfo(h, item, kLength, "zz", QTY_UNIT_SECOND), 2020);
    grdGetItemInfo_(item, nullptr, &name, nullptr, nullptr);
    EXPECT_STREQ(name, "a muc");
    ASSERT_EQ(grdUpdateItemInfo(h, item, kLength, nullptr, meter), 0);  // no name: all blanks
    grdGetItemInfo_(item, nullptr, &name, nullptr, nullptr);
    EXPECT_STREQ(name, "     ");
}

TEST_F(Item, SettingsAreStoredUnchanged) {
    makeHeader();
    ItemHandle item = makeItem();
    int32_t a = 0, b = 0;
    EXPECT_EQ(grdSetItemValueType(item, 42), 0);
    EXPECT_EQ(grdGetItemValueType(item, &a), 0);
    EXPECT_EQ(a, 42);
    EXPECT_EQ(grdGetItemValueType(item, nullptr), 1000);  // the out argument is required
    EXPECT_EQ(grdSetItemUnitConversion(item, 2, 1234), 0);
    EXPECT_EQ(grdGetItemUnitConversion(item, &a, &b), 0);
    EXPECT_EQ(a, 2);
    EXPECT_EQ(b, 1234);
    EXPECT_EQ(grdSetItemAxisUnitConversion(item, 7, 99), 0);
    EXPECT_EQ(grdGetItemAxisUnitConversion(item, &a, &b), 0);
    EXPECT_EQ(a, 7);
    EXPECT_EQ(b, 99);
    float alpha = 0, phi = 0, theta = 0;
    EXPECT_EQ(grdSetItemAxisOrientation(item, 10, 20, 30), 0);
    EXPECT_EQ(grdGetItemAxisOrientation(item, &alpha, &phi, &theta), 0);
    EXPECT_EQ(alpha, 10);
    EXPECT_EQ(phi, 20);
    EXPECT_EQ(theta, 30);
    EXPECT_EQ(takeCodes(), Codes{1000});

    // Null item: 1000, and -1e-35 in the float outputs.
    alpha = phi = theta = 0;
    float x = 0, y = 0, z = 0;
    EXPECT_EQ(grdGetItemAxisOrientation(nullptr, &alpha, &phi, &theta), 1000);
    EXPECT_EQ(grdGetItemRefCoords(nullptr, &x, &y, &z), 1000);
    for (float v : {alpha, phi, theta, x, y, z}) EXPECT_EQ(v, F_DELETE_VALUE_FLOAT);
    EXPECT_EQ(grdSetItemValueType(nullptr, 1), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000}));

    testing::internal::CaptureStdout();
    grdDebugOn(1);
    grdGetItemAxisOrientation(item, nullptr, nullptr, nullptr);
    grdDebugOn(0);
    EXPECT_NE(testing::internal::GetCapturedStdout().find("->{grdGetItemAxisOrigin"), std::string::npos);
}

TEST_F(Item, ReferenceCoordinatesFollowTheAxisConversionMode) {
    makeHeader();
    ItemHandle item = makeItem();
    const int32_t geometry = QTY_ITEM_GEOMETRY_0D;
    const int32_t base = unitOf(geometry, 1), other = unitOf(geometry, 2);
    ASSERT_NE(base, 0);
    ASSERT_NE(other, 0);
    ASSERT_EQ(grdSetItemAxisEqD0(item, other), 0);  // stored in the second unit
    float x = 0, y = 0, z = 0;

    // Mode 0: unchanged.
    grdSetItemRefCoords(item, 100, 200, 300);
    EXPECT_EQ(item->refX, 100);
    grdGetItemRefCoords(item, &x, &y, &z);
    EXPECT_EQ(x, 100);
    EXPECT_EQ(z, 300);

    // Mode 2: from the conversion unit into the axis unit, and back.
    grdSetItemAxisUnitConversion(item, 2, base);
    grdSetItemRefCoords(item, 100, 200, 300);
    EXPECT_FLOAT_EQ(item->refX, static_cast<float>(convert(base, 100, other)));
    grdGetItemRefCoords(item, &x, &y, &z);
    EXPECT_FLOAT_EQ(x, 100);
    EXPECT_FLOAT_EQ(y, 200);

    // Mode 3: the same direction (axis unit to base unit) on set and on get.
    grdSetItemAxisUnitConversion(item, 3, 0);
    grdSetItemRefCoords(item, 100, 0, 0);
    const double stored = convert(other, 100, base);
    EXPECT_FLOAT_EQ(item->refX, static_cast<float>(stored));
    grdGetItemRefCoords(item, &x, nullptr, nullptr);
    EXPECT_FLOAT_EQ(x, static_cast<float>(convert(other, static_cast<float>(stored), base)));

    // Mode 1: through the user unit of the geometry type.
    grdSetItemAxisUnitConversion(item, 1, 0);
    grdSetItemRefCoords(item, 100, 0, 0);
    double expected = 0;
    ASSERT_TRUE(qtyConvertFromUserUnit(geometry, other, 100, &expected));
    EXPECT_FLOAT_EQ(item->refX, static_cast<float>(expected));
    grdGetItemRefCoords(item, &x, nullptr, nullptr);
    EXPECT_FLOAT_EQ(x, 100);
}

TEST_F(Item, CompressedHeadersCountOnlyTheKeysElements) {
    HeaderHandle h = makeHeader(1, 2, 2);
    ItemHandle item = makeItem();
    ASSERT_EQ(grdSetItemAxisEqD2(item, 0, 20, 20, 0, 0, 1, 1), 0);
    EXPECT_EQ(grdGetItemElements(item), 400);
    EXPECT_EQ(grdGetItemBytes(item), 1600);

    int32_t key[100];
    for (int i = 0; i < 100; ++i) key[i] = i;
    ASSERT_EQ(grdSetEncodeKey(h, key, key, key, 100), 0);
    EXPECT_EQ(grdIsFileCompressed(h), 1);
    EXPECT_EQ(grdGetItemElements(item), 400);  // not before compression is enabled
    EXPECT_EQ(grdGetUsedItemElements(item), 100);
    EXPECT_EQ(grdGetUsedItemBytes(item), 400);
    EXPECT_EQ(grdItemEnableCompression(h), h);
    EXPECT_EQ(grdGetItemElements(item), 100);
    EXPECT_EQ(grdGetUsedItemElements(item), 100);
    EXPECT_EQ(grdGetItemBytes(item), 400);
    EXPECT_EQ(grdGetItemXYZSize(item), 400);  // sizes are not capped

    GrdItem staticItem;
    grdItemInit(&staticItem, F_DELETE_VALUE_FLOAT);
    staticItem.isStatic = 1;
    ASSERT_EQ(grdSetItemInfo(h, &staticItem, QTY_ITEM_UNDEFINED, "s", 0, 2), 0);
    ASSERT_EQ(grdSetItemAxisEqD2(&staticItem, 0, 20, 20, 0, 0, 1, 1), 0);
    EXPECT_EQ(grdGetItemElements(&staticItem), 400);
    EXPECT_EQ(grdGetUsedItemElements(&staticItem), 400);
    EXPECT_EQ(grdGetUsedItemBytes(&staticItem), 3200);

    // A key longer than the item leaves the full count.
    ItemHandle small = makeItem(2);
    ASSERT_EQ(grdSetItemAxisEqD1(small, 0, 30, 0, 1), 0);
    EXPECT_EQ(grdGetItemElements(small), 30);
    EXPECT_EQ(grdItemEnableCompression(nullptr), nullptr);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Item, EncodeKeysAreCopiedAndAbsentKeysStayAbsent) {
    HeaderHandle h = makeHeader();
    ItemHandle item = makeItem();
    int32_t length = -1;
    EXPECT_EQ(grdIsItemCompressed(item, &length), 0);
    EXPECT_EQ(length, 0);
    const int32_t x[3] = {1, 2, 3}, z[3] = {7, 8, 9};
    ASSERT_EQ(grdSetEncodeKey(h, x, nullptr, z, 3), 0);
    EXPECT_EQ(grdGetEncodeKeySize(h), 3);
    int32_t bx[3] = {}, by[3] = {-1, -1, -1}, bz[3] = {};
    EXPECT_EQ(grdGetEncodeKey(h, bx, by, bz), 0);
    EXPECT_EQ(bx[2], 3);
    EXPECT_EQ(by[0], -1);  // no y key: the buffer is left alone
    EXPECT_EQ(bz[0], 7);
    // Without a y key the item does not count as compressed.
    EXPECT_EQ(grdIsItemCompressed(item, &length), 0);
    EXPECT_EQ(length, 0);
    ASSERT_EQ(grdSetEncodeKey(h, x, x, nullptr, 3), 0);
    EXPECT_EQ(grdIsItemCompressed(item, &length), 0);
    EXPECT_EQ(length, 3);
    EXPECT_EQ(h->keyZ, nullptr);  // replaced by the new set
    EXPECT_EQ(grdIsItemCompressed(nullptr, &length), 1000);
    EXPECT_EQ(length, 0);
    EXPECT_EQ(grdSetEncodeKey(h, x, x, x, -1), 2010);
    EXPECT_EQ(grdSetEncodeKey(nullptr, x, x, x, 3), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 2010, 1000}));
}

TEST_F(Item, StaticAssociationsAppendInOrder) {
    HeaderHandle h = makeHeader(1, 2);
    EXPECT_EQ(grdGetNoAssocStatic(h, 2), 0);
    EXPECT_EQ(grdSetAssocStatic(h, 2, 5), 0);
    EXPECT_EQ(grdSetAssocStatic(h, 2, 3), 0);
    EXPECT_EQ(grdGetNoAssocStatic(h, 2), 2);
    EXPECT_EQ(grdGetNoAssocStatic(h, 1), 0);
    int32_t no = -1;
    EXPECT_EQ(grdGetAssocStatic(h, 2, 1, &no), 0);
    EXPECT_EQ(no, 5);
    EXPECT_EQ(grdGetAssocStatic(h, 2, 2, &no), 0);
    EXPECT_EQ(no, 3);
    EXPECT_EQ(grdGetAssocStatic(h, 2, 3, &no), 0);  // past the chain: 0
    EXPECT_EQ(no, 0);
    EXPECT_EQ(grdGetAssocStatic(h, 2, 1, nullptr), 0);
    EXPECT_TRUE(takeCodes().empty());

    EXPECT_EQ(grdSetAssocStatic(h, 2, 0), 2007);
    EXPECT_EQ(grdGetAssocStatic(h, 2, 0, &no), 2007);
    EXPECT_EQ(grdSetAssocStatic(h, 3, 1), 2007);
    EXPECT_EQ(grdGetNoAssocStatic(h, 0), 0);
    EXPECT_EQ(grdSetAssocStatic(nullptr, 1, 1), 1000);
    EXPECT_EQ(takeCodes(), (Codes{2007, 2007, 2007, 2007, 1000}));
    // The associations survive an info reset.
    ASSERT_EQ(grdSetItemInfo(h, grdItemD(h, 2), QTY_ITEM_UNDEFINED, "x", 0, 1), 0);
    EXPECT_EQ(grdGetNoAssocStatic(h, 2), 2);
}

TEST_F(Item, StatisticsStartAtTheDeleteValueForElementTypes) {
    HeaderHandle h = makeHeader(1, 1, 3);
    h->deleteValDouble = -7.0;
    ItemHandle item = makeItem();
    ASSERT_EQ(item->elemStatsCount, 1);  // EqD0: one element
    EXPECT_EQ(item->elemStats[0].max, -7.0);
    EXPECT_EQ(item->elemStats[0].min, -7.0);
    EXPECT_EQ(item->elemStats[0].previous, -7.0);
    EXPECT_EQ(item->elemStats[0].sum, 0.0);
    EXPECT_EQ(item->globalMax, -7.0);
    EXPECT_EQ(item->globalMin, -7.0);
    EXPECT_EQ(item->globalDeletes, 0.0);

    makeHeader(1, 1, 1);
    ItemHandle plain = makeItem();
    EXPECT_EQ(plain->elemStats, nullptr);
    EXPECT_EQ(plain->globalMax, F_DELETE_VALUE_DOUBLE);
}

}  // namespace
