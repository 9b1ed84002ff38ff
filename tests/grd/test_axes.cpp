// Item spatial axes: every kind's setter/getter pair, the checks of the
// setters (file-type family, sizes, steps, arrays, static items), the size
// table, dimensions and geometry, unit conversion of axis values (including
// the in-place conversion of coordinate arrays) and statistics re-allocation.
#include <cmath>
#include <vector>

#include "test_header_support.h"

namespace {

using grdtest::Codes;
using grdtest::convert;
using grdtest::GrdTest;
using grdtest::unitOf;

class Axes : public GrdTest {};

TEST_F(Axes, EquidistantAxesRoundTrip) {
    makeHeader();
    ItemHandle item = makeItem();
    int32_t unit = -1, x = 0, y = 0, z = 0, t = 0;
    const char* unitText = nullptr;
    float o[4] = {}, d[4] = {};

    ASSERT_EQ(grdSetItemAxisEqD0(item, 0), 0);
    EXPECT_EQ(grdGetItemAxisEqD0(item, &unit, &unitText), 0);
    EXPECT_EQ(unit, 0);
    EXPECT_NE(unitText, nullptr);

    ASSERT_EQ(grdSetItemAxisEqD1(item, 0, 7, 1.5f, 0.5f), 0);
    EXPECT_EQ(grdGetItemAxisEqD1(item, &unit, nullptr, &x, &o[0], &d[0]), 0);
    EXPECT_EQ(x, 7);
    EXPECT_EQ(o[0], 1.5f);
    EXPECT_EQ(d[0], 0.5f);

    ASSERT_EQ(grdSetItemAxisEqD2(item, 0, 3, 4, 1, 2, 10, 20), 0);
    EXPECT_EQ(grdGetItemAxisEqD2(item, nullptr, nullptr, &x, &y, &o[0], &o[1], &d[0], &d[1]), 0);
    EXPECT_EQ(x * 10 + y, 34);
    EXPECT_EQ(o[1], 2);
    EXPECT_EQ(d[1], 20);
    // Stored as sizes, then origins, then steps.
    EXPECT_EQ(item->origin[0], 1);
    EXPECT_EQ(item->step[0], 10);

    ASSERT_EQ(grdSetItemAxisEqD3(item, 0, 2, 3, 4, 1, 2, 3, 4, 5, 6), 0);
    EXPECT_EQ(grdGetItemAxisEqD3(item, nullptr, nullptr, &x, &y, &z, &o[0], &o[1], &o[2], &d[0], &d[1], &d[2]), 0);
    EXPECT_EQ(z, 4);
    EXPECT_EQ(o[2], 3);
    EXPECT_EQ(d[2], 6);

    ASSERT_EQ(grdSetItemAxisEqD4(item, 0, 2, 3, 4, 5, 1, 2, 3, 4, 5, 6, 7, 8), 0);
    EXPECT_EQ(grdGetItemAxisEqD4(item, nullptr, nullptr, &x, &y, &z, &t, &o[0], &o[1], &o[2], &o[3], &d[0], &d[1],
                                 &d[2], &d[3]),
              0);
    EXPECT_EQ(t, 5);
    EXPECT_EQ(o[3], 4);
    EXPECT_EQ(d[3], 8);
    EXPECT_EQ(grdGetItemXYZSize(item), 120);
    // Every out argument may be null.
    EXPECT_EQ(grdGetItemAxisEqD4(item, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr,
                                 nullptr, nullptr, nullptr, nullptr, nullptr, nullptr),
              0);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Axes, CoordinateAxesCopyTheirArrays) {
    makeHeader();
    ItemHandle item = makeItem();
    std::vector<double> xs(11), ys(5), zs(3);
    for (size_t i = 0; i < xs.size(); ++i) xs[i] = 0.5 * static_cast<double>(i);
    for (size_t i = 0; i < ys.size(); ++i) ys[i] = 10.0 + static_cast<double>(i);
    for (size_t i = 0; i < zs.size(); ++i) zs[i] = -static_cast<double>(i);
    int32_t x = 0, y = 0, z = 0;
    const double *ax = nullptr, *ay = nullptr, *az = nullptr;

    ASSERT_EQ(grdSetItemAxisNeqD1(item, 0, 10, xs.data(), 0), 0);  // 11 boundaries
    xs[10] = 99;
    ASSERT_EQ(grdGetItemAxisNeqD1(item, nullptr, nullptr, &x, &ax), 0);
    EXPECT_EQ(x, 10);
    ASSERT_NE(ax, xs.data());
    EXPECT_EQ(ax[10], 5.0);
    xs[10] = 5.0;

    ASSERT_EQ(grdSetItemAxisNeqD2(item, 0, 10, 4, xs.data(), ys.data(), 0), 0);
    ASSERT_EQ(grdGetItemAxisNeqD2(item, nullptr, nullptr, &x, &y, &ax, &ay), 0);
    EXPECT_EQ(ay[4], 14.0);
    EXPECT_EQ(grdGetItemXYZSize(item), 40);

    ASSERT_EQ(grdSetItemAxisNeqD3(item, 0, 10, 4, 2, xs.data(), ys.data(), zs.data(), 0), 0);
    ASSERT_EQ(grdGetItemAxisNeqD3(item, nullptr, nullptr, &x, &y, &z, &ax, &ay, &az), 0);
    EXPECT_EQ(z, 2);
    EXPECT_EQ(az[2], -2.0);

    // Curvilinear: one value per node, (X+1)(Y+1) = 12 for 3 x 2.
    std::vector<double> nx(24), ny(24), nz(24);  // room for the 3-D case below
    for (size_t i = 0; i < nz.size(); ++i) {
        nx[i] = static_cast<double>(i);
        ny[i] = 100.0 + static_cast<double>(i);
        nz[i] = 1000.0 + static_cast<double>(i);
    }
    ASSERT_EQ(grdSetItemAxisCurveLinearD2(item, 0, 3, 2, nx.data(), ny.data(), 0), 0);
    ASSERT_EQ(grdGetItemAxisCurveLinearD2(item, nullptr, nullptr, &x, &y, &ax, &ay), 0);
    EXPECT_EQ(ax[11], 11.0);
    EXPECT_EQ(ay[11], 111.0);
    EXPECT_EQ(grdGetItemXYZSize(item), 6);
    ASSERT_EQ(grdSetItemAxisCurveLinearD3(item, 0, 3, 2, 1, nx.data(), ny.data(), nz.data(), 0), 0);
    EXPECT_EQ(grdGetItemAxisCurveLinearD3(item, nullptr, nullptr, &x, &y, &z, &ax, &ay, &az), 0);
    EXPECT_EQ(az[23], 1023.0);  // (3+1)(2+1)(1+1) = 24 nodes
    EXPECT_EQ(grdGetItemXYZSize(item), 6);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Axes, TimeVaryingAxesNeedTheTimeVaryingFileTypes) {
    for (int32_t fileType : {F_EQTIME_TVARSPACE_ALLITEMS, F_NEQTIME_TVARSPACE_VARITEMS}) {
        makeHeader(fileType);
        ItemHandle item = makeItem();
        int32_t x = 0, y = 0, z = 0;
        ASSERT_EQ(grdSetItemAxisTvarD1(item, 0, 5), 0);
        EXPECT_EQ(grdGetItemAxisTvarD1(item, nullptr, nullptr, &x), 0);
        EXPECT_EQ(x, 5);
        ASSERT_EQ(grdSetItemAxisTvarD2(item, 0, 5, 6), 0);
        EXPECT_EQ(grdGetItemAxisTvarD2(item, nullptr, nullptr, &x, &y), 0);
        EXPECT_EQ(y, 6);
        ASSERT_EQ(grdSetItemAxisTvarD3(item, 0, 5, 6, 7), 0);
        EXPECT_EQ(grdGetItemAxisTvarD3(item, nullptr, nullptr, &x, &y, &z), 0);
        EXPECT_EQ(z, 7);
        // Fixed-space axes are refused on these file types.
        EXPECT_EQ(grdSetItemAxisEqD1(item, 0, 5, 0, 1), 2010);
        EXPECT_EQ(takeCodes(), Codes{2010});
    }
    for (int32_t fileType : {F_EQTIME_FIXEDSPACE_ALLITEMS, F_NEQTIME_FIXEDSPACE_ALLITEMS,
                             F_NEQTIME_FIXEDSPACE_VARITEMS}) {
        makeHeader(fileType);
        ItemHandle item = makeItem();
        EXPECT_EQ(grdSetItemAxisTvarD1(item, 0, 5), 2010);
        EXPECT_EQ(grdSetItemAxisEqD1(item, 0, 5, 0, 1), 0);
        EXPECT_EQ(takeCodes(), Codes{2010});
    }
    makeHeader(3);  // not a valid file type: nothing fits
    ItemHandle item = makeItem();
    EXPECT_EQ(grdSetItemAxisEqD1(item, 0, 5, 0, 1), 2010);
    EXPECT_EQ(grdSetItemAxisTvarD1(item, 0, 5), 2010);
    EXPECT_EQ(takeCodes(), (Codes{2010, 2010}));
}

TEST_F(Axes, SettersRefuseBadSizesStepsAndMissingArraysLeavingTheOldAxis) {
    makeHeader();
    ItemHandle item = makeItem();
    const double c[4] = {0, 1, 2, 3};
    ASSERT_EQ(grdSetItemAxisEqD2(item, 0, 10, 10, 0, 0, 1, 1), 0);
    EXPECT_EQ(grdSetItemAxisEqD2(item, 0, 0, 10, 0, 0, 1, 1), 1000);
    EXPECT_EQ(grdSetItemAxisEqD2(item, 0, 10, -1, 0, 0, 1, 1), 1000);
    EXPECT_EQ(grdSetItemAxisEqD2(item, 0, 10, 10, 0, 0, 0, 1), 1000);
    EXPECT_EQ(grdSetItemAxisEqD2(item, 0, 10, 10, 0, 0, 1, -2), 1000);
    EXPECT_EQ(grdSetItemAxisEqD1(item, 0, 3, 0, std::nanf("")), 1000);
    EXPECT_EQ(grdSetItemAxisNeqD2(item, 0, 3, 3, c, nullptr, 0), 1000);
    EXPECT_EQ(grdSetItemAxisCurveLinearD2(item, 0, 1, 1, nullptr, c, 0), 1000);
    EXPECT_EQ(grdSetItemAxisNeqD1(item, 0, 0, c, 0), 1000);
    EXPECT_EQ(grdSetItemAxisTvarD1(nullptr, 0, 3), 1000);
    EXPECT_EQ(takeCodes(), Codes(9, 1000));
    int32_t x = 0, y = 0;
    EXPECT_EQ(grdGetItemAxisEqD2(item, nullptr, nullptr, &x, &y, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(x, 10);
    EXPECT_EQ(y, 10);

    // An item without info has no owner header to check against.
    ItemHandle fresh = grdItemD(header_, 2);
    EXPECT_EQ(grdSetItemAxisEqD1(fresh, 0, 3, 0, 1), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});
}

TEST_F(Axes, StaticItemsSkipTheChecks) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 2);
    GrdItem item;
    grdItemInit(&item, F_DELETE_VALUE_FLOAT);
    item.isStatic = 1;
    ASSERT_EQ(grdSetItemInfo(h, &item, QTY_ITEM_UNDEFINED, "static", 0, 1), 0);
    EXPECT_EQ(grdSetItemAxisEqD2(&item, 0, 0, 10, 0, 0, 0, 1), 0);
    EXPECT_EQ(grdGetItemElements(&item), 0);
    EXPECT_EQ(grdSetItemAxisTvarD1(&item, 0, 4), 0);  // any file type
    const double c[3] = {1, 2, 3};
    EXPECT_EQ(grdSetItemAxisNeqD2(&item, 0, 2, 2, c, nullptr, 0), 0);  // a direction left out
    EXPECT_EQ(item.coords[1], nullptr);
    EXPECT_EQ(item.coords[0][2], 3.0);
    // Static items carry no statistics.
    EXPECT_EQ(item.elemStats, nullptr);
    // Negative sizes are refused even here.
    EXPECT_EQ(grdSetItemAxisEqD1(&item, 0, -1, 0, 1), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});
}

TEST_F(Axes, GettersRefuseOtherAxisKinds) {
    makeHeader();
    ItemHandle item = makeItem();
    const double xs[4] = {0, 1, 2, 3}, ys[3] = {0, 1, 2};
    ASSERT_EQ(grdSetItemAxisNeqD2(item, 0, 3, 2, xs, ys, 0), 0);
    ASSERT_EQ(grdSetItemAxisNeqD2(item, 0, 2, 1, xs, ys, 0), 0);  // replaces (and frees) the first copies
    int32_t x = -1;
    EXPECT_EQ(grdGetItemAxisEqD2(item, nullptr, nullptr, &x, nullptr, nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(x, -1);  // nothing given
    EXPECT_EQ(grdGetItemAxisNeqD1(item, nullptr, nullptr, &x, nullptr), 1000);
    EXPECT_EQ(grdGetItemAxisTvarD2(item, nullptr, nullptr, &x, nullptr), 1000);
    EXPECT_EQ(grdGetItemAxisEqD0(nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(takeCodes(), Codes(4, 1000));
    EXPECT_EQ(grdGetItemAxisType(item), F_NEQ_AXIS_D2);
    EXPECT_EQ(grdGetItemAxisType(nullptr), 0);
    takeCodes();
}

TEST_F(Axes, SizeTableDimensionsAndGeometryPerAxisKind) {
    makeHeader();
    ItemHandle item = makeItem();
    const double c[64] = {};
    struct Row {
        int32_t type, x, xy, xyz, dim, geometry;
    };
    // Sizes 2 x 3 x 4 x 5 where the kind has them.
    const Row rows[] = {
        {1, 1, 1, 1, 0, 100185},      {2, 2, 1, 2, 1, 100186},      {3, 2, 0, 2, 1, 100186},
        {4, 2, 0, 2, 1, 100186},      {5, 2, 6, 6, 2, 100187},      {6, 2, 6, 6, 2, 100187},
        {7, 2, 6, 6, 2, 100187},      {8, 2, 6, 24, 3, 100188},     {9, 2, 6, 24, 3, 100188},
        {10, 2, 6, 24, 3, 100188},    {11, 2, 6, 120, 4, 100188},   {12, 2, 6, 6, -1, 999},
        {13, 2, 6, 24, -1, 999},
    };
    for (const Row& r : rows) {
        // Set through the static path so that every kind fits one header.
        item->isStatic = 1;
        int32_t status = 0;
        switch (r.type) {
            case 1: status = grdSetItemAxisEqD0(item, 5); break;
            case 2: status = grdSetItemAxisEqD1(item, 5, 2, 0, 1); break;
            case 3: status = grdSetItemAxisNeqD1(item, 5, 2, c, 0); break;
            case 4: status = grdSetItemAxisTvarD1(item, 5, 2); break;
            case 5: status = grdSetItemAxisEqD2(item, 5, 2, 3, 0, 0, 1, 1); break;
            case 6: status = grdSetItemAxisNeqD2(item, 5, 2, 3, c, c, 0); break;
            case 7: status = grdSetItemAxisTvarD2(item, 5, 2, 3); break;
            case 8: status = grdSetItemAxisEqD3(item, 5, 2, 3, 4, 0, 0, 0, 1, 1, 1); break;
            case 9: status = grdSetItemAxisNeqD3(item, 5, 2, 3, 4, c, c, c, 0); break;
            case 10: status = grdSetItemAxisTvarD3(item, 5, 2, 3, 4); break;
            case 11: status = grdSetItemAxisEqD4(item, 5, 2, 3, 4, 5, 0, 0, 0, 0, 1, 1, 1, 1); break;
            case 12: status = grdSetItemAxisCurveLinearD2(item, 5, 2, 3, c, c, 0); break;
            case 13: status = grdSetItemAxisCurveLinearD3(item, 5, 2, 3, 4, c, c, c, 0); break;
        }
        item->isStatic = 0;
        ASSERT_EQ(status, 0) << r.type;
        EXPECT_EQ(grdGetItemAxisType(item), r.type);
        EXPECT_EQ(grdGetItemXSize(item), r.x) << r.type;
        EXPECT_EQ(grdGetItemXYSize(item), r.xy) << r.type;
        EXPECT_EQ(grdGetItemXYZSize(item), r.xyz) << r.type;
        EXPECT_EQ(grdGetItemElements(item), r.xyz) << r.type;
        EXPECT_EQ(grdGetItemDim(item), r.dim) << r.type;
        EXPECT_EQ(grdGetItemGeometryType(item), r.geometry) << r.type;
        EXPECT_EQ(grdGetItemGeometryUnit(item), 5) << r.type;
        // NeqD1 and TvarD1 have no XY size (EqD1 has): 2010 reported.
        EXPECT_EQ(takeCodes(), r.xy == 0 ? Codes{2010} : Codes{}) << r.type;
    }
    // An undefined axis has no sizes at all.
    ItemHandle fresh = grdItemD(header_, 2);
    EXPECT_EQ(grdGetItemXSize(fresh), 0);
    EXPECT_EQ(grdGetItemXYSize(fresh), 0);
    EXPECT_EQ(grdGetItemXYZSize(fresh), 0);
    EXPECT_EQ(takeCodes(), (Codes{2010, 2010, 2010}));
    EXPECT_EQ(grdGetItemDim(fresh), -1);
    EXPECT_EQ(grdGetItemGeometryType(fresh), 999);
    EXPECT_EQ(grdGetItemGeometryUnit(fresh), 0);
    EXPECT_EQ(grdGetItemBytes(fresh), 0);
    takeCodes();
    // Null items: 0 with 1000.
    EXPECT_EQ(grdGetItemXSize(nullptr), 0);
    EXPECT_EQ(grdGetItemElements(nullptr), 0);
    EXPECT_EQ(grdGetUsedItemBytes(nullptr), 0);
    EXPECT_EQ(takeCodes(), Codes(3, 1000));
}

TEST_F(Axes, ElementBytesFollowTheDataType) {
    makeHeader(1, 7);
    const int32_t widths[8] = {0, 4, 8, 1, 4, 4, 2, 2};
    for (int32_t type = 1; type <= 7; ++type) {
        ItemHandle item = makeItem(type, type);
        ASSERT_EQ(grdSetItemAxisEqD1(item, 0, 10, 0, 1), 0);
        EXPECT_EQ(grdGetItemBytes(item), 10 * widths[type]) << type;
        EXPECT_EQ(grdGetUsedItemBytes(item), 10 * widths[type]) << type;
    }
    ItemHandle odd = makeItem(1, 9);  // not a simple type: no bytes
    ASSERT_EQ(grdSetItemAxisEqD1(odd, 0, 10, 0, 1), 0);
    EXPECT_EQ(grdGetItemBytes(odd), 0);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(Axes, EquidistantValuesConvertAndModeThreeRoundTrips) {
    makeHeader();
    ItemHandle item = makeItem();
    const int32_t geometry = QTY_ITEM_GEOMETRY_1D;
    const int32_t base = unitOf(geometry, 1), other = unitOf(geometry, 2);
    ASSERT_NE(other, 0);
    float x0 = 0, dx = 0;

    // Mode 2: given in the conversion unit, stored in the axis unit.
    grdSetItemAxisUnitConversion(item, 2, base);
    ASSERT_EQ(grdSetItemAxisEqD1(item, other, 4, 100, 10), 0);
    EXPECT_FLOAT_EQ(item->origin[0], static_cast<float>(convert(base, 100, other)));
    EXPECT_FLOAT_EQ(item->step[0], static_cast<float>(convert(base, 10, other)));
    grdGetItemAxisEqD1(item, nullptr, nullptr, nullptr, &x0, &dx);
    EXPECT_FLOAT_EQ(x0, 100);
    EXPECT_FLOAT_EQ(dx, 10);

    // Mode 3: from the base unit on set, into it on get (unlike the
    // reference coordinates).
    grdSetItemAxisUnitConversion(item, 3, 0);
    ASSERT_EQ(grdSetItemAxisEqD1(item, other, 4, 100, 10), 0);
    EXPECT_FLOAT_EQ(item->origin[0], static_cast<float>(convert(base, 100, other)));
    grdGetItemAxisEqD1(item, nullptr, nullptr, nullptr, &x0, &dx);
    EXPECT_FLOAT_EQ(x0, 100);
    EXPECT_FLOAT_EQ(dx, 10);

    // The unit text of the axis comes from the unit library.
    const char* text = nullptr;
    const char* expected = nullptr;
    ASSERT_TRUE(qtyGetUnitKey(other, &expected));
    grdGetItemAxisEqD1(item, nullptr, &text, nullptr, nullptr, nullptr);
    EXPECT_STREQ(text, expected);
}

TEST_F(Axes, CoordinateGettersConvertTheStoredArraysInPlace) {
    makeHeader();
    ItemHandle item = makeItem();
    const int32_t geometry = QTY_ITEM_GEOMETRY_1D;
    const int32_t base = unitOf(geometry, 1), other = unitOf(geometry, 2);
    const double xs[3] = {0, 1000, 2000};
    const double* got = nullptr;

    // Mode 0: the stored values every time.
    ASSERT_EQ(grdSetItemAxisNeqD1(item, base, 2, xs, 0), 0);
    grdGetItemAxisNeqD1(item, nullptr, nullptr, nullptr, &got);
    grdGetItemAxisNeqD1(item, nullptr, nullptr, nullptr, &got);
    EXPECT_EQ(got[1], 1000);

    // Mode 2: the set converts into the axis unit; each get converts the
    // item's own array again.
    grdSetItemAxisUnitConversion(item, 2, other);
    ASSERT_EQ(grdSetItemAxisNeqD1(item, base, 2, xs, 0), 0);
    const double stored = convert(other, 1000, base);
    EXPECT_DOUBLE_EQ(item->coords[0][1], stored);
    grdGetItemAxisNeqD1(item, nullptr, nullptr, nullptr, &got);
    EXPECT_EQ(got, item->coords[0].get());  // lent, not copied
    EXPECT_DOUBLE_EQ(got[1], 1000);
    grdGetItemAxisNeqD1(item, nullptr, nullptr, nullptr, &got);
    EXPECT_DOUBLE_EQ(got[1], convert(base, 1000, other));
    // Delete values pass unconverted.
    const double withDelete[3] = {0, F_DELETE_VALUE_DOUBLE, 1};
    ASSERT_EQ(grdSetItemAxisNeqD1(item, base, 2, withDelete, 0), 0);
    EXPECT_EQ(item->coords[0][1], F_DELETE_VALUE_DOUBLE);
}

TEST_F(Axes, StatisticsAreReallocatedOnlyWhenTheElementCountChanges) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 2);
    ItemHandle item = makeItem();
    ASSERT_EQ(grdSetItemAxisEqD2(item, 0, 10, 10, 0, 0, 1, 1), 0);
    ASSERT_EQ(item->elemStatsCount, 100);
    item->elemStats[5].sum = 42.0;  // as accumulated by written time steps
    ASSERT_EQ(grdSetItemAxisEqD2(item, 0, 10, 10, 5, 5, 2, 2), 0);
    EXPECT_EQ(item->elemStats[5].sum, 42.0);
    ASSERT_EQ(grdSetItemAxisEqD2(item, 0, 10, 11, 0, 0, 1, 1), 0);
    EXPECT_EQ(item->elemStatsCount, 110);
    EXPECT_EQ(item->elemStats[5].sum, 0.0);
    EXPECT_EQ(item->elemStats[5].max, F_DELETE_VALUE_DOUBLE);
    // Same count through another kind: kept.
    item->elemStats[5].sum = 7.0;
    const double c[12] = {};
    ASSERT_EQ(grdSetItemAxisNeqD2(item, 0, 11, 10, c, c, 0), 0);
    EXPECT_EQ(item->elemStats[5].sum, 7.0);
}

}  // namespace
