// Cross-section objects in memory: defaults, key order, data-set sizing,
// taking data blocks and building from key and header blocks of every format
// version.
#include <memory>

#include "xfs_testutil.h"

using namespace xfstest;

namespace {

// A record list built from records, freed at the end of the scope.
struct List {
    LrecNode* head = nullptr;
    explicit List(const std::vector<Rec>& records) {
        for (const Rec& r : records) {
            LrecNode* node = rcfLrecNodeNew(r.type, r.count, r.bytes.data(), 1, head);
            if (head == nullptr) head = node;
        }
    }
    ~List() { rcfLrecListFree(&head); }
    List(const List&) = delete;
    List& operator=(const List&) = delete;
};

std::vector<double> column(size_t n, double base) {
    std::vector<double> v(n);
    for (size_t i = 0; i < n; ++i) v[i] = base + static_cast<double>(i);
    return v;
}

std::vector<uint16_t> ramp(size_t n, uint16_t base) {
    std::vector<uint16_t> v(n);
    for (size_t i = 0; i < n; ++i) v[i] = static_cast<uint16_t>(base + i);
    return v;
}

void expectDefaultHeader(const XsecData* x, int fromWord, int fromValue) {
    for (int i = fromWord; i < 25; ++i) EXPECT_EQ(x->headerWords[i], i == 23 ? 2 : 0) << "word " << i;
    for (int i = fromValue; i < 23; ++i) {
        const double expected = i < 10 ? 0.0 : i == 15 ? 0.001 : 1.0;
        EXPECT_EQ(get(x->headerValues[i]), expected) << "value " << i;
    }
}

}  // namespace

TEST(XsecObject, NewCrossSectionHasItsNamesAndDefaults) {
    Owned owned;
    XsecHandle plain = owned.add("River", 12.5, "Reach");
    EXPECT_STREQ(plain->primaryName, "River");
    EXPECT_STREQ(plain->secondaryName, "Reach");
    EXPECT_STREQ(plain->extraName, " ");
    EXPECT_EQ(get(plain->keyValue), 12.5);
    EXPECT_EQ(get(plain->owner), static_cast<void*>(xsecResolve(plain)));
    EXPECT_EQ(get(plain->noRaw) + get(plain->noSel) + get(plain->noPrc) + get(plain->noCoords), 0u);
    EXPECT_EQ(get(plain->raw[0]), nullptr);
    expectDefaultHeader(plain, 0, 0);

    EXPECT_STREQ(owned.add("a", 0, "b", "")->extraName, " ");
    EXPECT_STREQ(owned.add("a", 0, "b", "station 4")->extraName, "station 4");
    XsecHandle viaCreate = xfsXsecCreate("a", 0, "b");
    EXPECT_STREQ(viaCreate->extraName, " ");
    xfsXsecFree(&viaCreate);
    EXPECT_EQ(viaCreate, nullptr);

    EXPECT_EQ(xfsXsecCreate(nullptr, 1.0, "b"), nullptr);
    EXPECT_EQ(xfsXsecCreateEx("a", 1.0, nullptr, "x"), nullptr);
    CTDxSec invalid(nullptr, 1.0, "b");
    EXPECT_EQ(invalid.validFlag, 0u);
    EXPECT_EQ(invalid.publicRecord(), nullptr);
    EXPECT_EQ(invalid.setCount(XsecSet::Raw, 3), 0u);
}

TEST(XsecObject, KeyOrderIgnoresCaseAndPutsNamesBeforeTheValue) {
    EXPECT_LT(xsecKeyOrder("a", "x", 0, "B", "x", 0), 0);
    EXPECT_GT(xsecKeyOrder("b", "x", 0, "A", "x", 0), 0);
    EXPECT_EQ(xsecKeyOrder("RIVER", "Reach", 3, "river", "REACH", 3), 0);
    // Names decide before the value; the value decides numerically.
    EXPECT_LT(xsecKeyOrder("a", "z", 100, "b", "a", -100), 0);
    EXPECT_LT(xsecKeyOrder("a", "a", 99, "a", "b", -5), 0);
    EXPECT_LT(xsecKeyOrder("a", "a", 9, "a", "a", 10), 0);
    EXPECT_GT(xsecKeyOrder("a", "a", -1, "a", "a", -2), 0);
    // A prefix sorts first; letters are lowered before comparing with others.
    EXPECT_LT(xsecKeyOrder("ab", "", 0, "abc", "", 0), 0);
    EXPECT_LT(xsecKeyOrder("_", "", 0, "A", "", 0), 0);
    // Null names order as empty ones.
    EXPECT_EQ(xsecKeyOrder(nullptr, "s", 1, "", "s", 1), 0);

    CTDxSec low("a", 1, "x");
    CTDxSec high("B", 0, "x");
    EXPECT_TRUE(low.compareKey(high, -1));
    EXPECT_FALSE(low.compareKey(high, 0));
    EXPECT_TRUE(high.compareKey(low, +1));
    EXPECT_TRUE(low.compareKey(low, 0));
}

TEST(XsecObject, SetCountsAllocateZeroedArraysAndZeroFreesTheSet) {
    Owned owned;
    XsecHandle x = owned.add("a", 1, "b");
    ASSERT_EQ(xfsXsecSetNoRaw(x, 4), 1);
    ASSERT_EQ(xfsXsecSetNoSel(x, 2), 1);
    ASSERT_EQ(xfsXsecSetNoPrc(x, 3), 1);
    ASSERT_EQ(xfsXsecSetNoCoords(x, 5), 1);
    EXPECT_EQ(get(x->noRaw), 4u);
    EXPECT_EQ(get(x->noSel), 2u);
    EXPECT_EQ(get(x->noPrc), 3u);
    EXPECT_EQ(get(x->noCoords), 5u);
    for (uint32_t i = 0; i < 4; ++i)
        EXPECT_EQ(x->raw[0][i] + x->raw[1][i] + x->raw[2][i] + x->raw3[i] + x->rawMark[0][i] + x->rawMark[1][i], 0);
    for (int c = 0; c < 6; ++c) EXPECT_NE(get(x->prc[c]), nullptr);
    EXPECT_EQ(x->coords[2][4], 0.0);

    // Only the low 16 bits count.
    ASSERT_EQ(xfsXsecSetNoSel(x, 0x10003u), 1);
    EXPECT_EQ(get(x->noSel), 3u);

    // Zero frees the set and keeps the cross section valid.
    ASSERT_EQ(xfsXsecSetNoRaw(x, 0), 1);
    EXPECT_EQ(get(x->noRaw), 0u);
    EXPECT_EQ(get(x->raw[0]), nullptr);
    EXPECT_EQ(get(x->raw3), nullptr);
    EXPECT_EQ(get(x->rawMark[1]), nullptr);
    ASSERT_EQ(xfsXsecSetNoCoords(x, 0x10000u), 1);
    EXPECT_EQ(get(x->coords[0]), nullptr);
    EXPECT_EQ(xfsXsecSetNoPrc(x, 2), 1);
}

TEST(XsecObject, DataBlocksAreTakenWhole) {
    CTDxSec sec("a", 1, "b");
    {
        List raw({doubles(column(3, 0)), doubles(column(3, 10)), doubles(column(3, 20)), doubles(column(3, 30)),
                  words(ramp(3, 1)), words(ramp(3, 100))});
        ASSERT_EQ(sec.takeRecords(XsecSet::Raw, raw.head), 1u);
        // The buffers were taken over, not copied.
        EXPECT_EQ(raw.head->data, nullptr);
    }
    EXPECT_EQ(get(sec.rec.noRaw), 3u);
    EXPECT_EQ(sec.rec.raw[2][1], 21.0);
    EXPECT_EQ(sec.rec.raw3[2], 32.0);
    EXPECT_EQ(sec.rec.rawMark[1][2], 102);

    // An older raw block of three columns: columns 3-5 are zero-filled.
    {
        List raw({doubles(column(2, 5)), doubles(column(2, 6)), doubles(column(2, 7))});
        ASSERT_EQ(sec.takeRecords(XsecSet::Raw, raw.head), 1u);
    }
    EXPECT_EQ(get(sec.rec.noRaw), 2u);
    EXPECT_EQ(sec.rec.raw[0][1], 6.0);
    EXPECT_EQ(sec.rec.raw3[1], 0.0);
    EXPECT_EQ(sec.rec.rawMark[0][1], 0);
    EXPECT_EQ(sec.rec.rawMark[1][0], 0);

    {
        List coords({doubles(column(4, 1)), doubles(column(4, 2)), doubles(column(4, 3))});
        List sel({doubles(column(7, 9))});
        List prc({doubles(column(1, 0)), doubles(column(1, 1)), doubles(column(1, 2)), doubles(column(1, 3)),
                  doubles(column(1, 4)), doubles(column(1, 5))});
        ASSERT_EQ(sec.takeRecords(XsecSet::Coords, coords.head), 1u);
        ASSERT_EQ(sec.takeRecords(XsecSet::Sel, sel.head), 1u);
        ASSERT_EQ(sec.takeRecords(XsecSet::Prc, prc.head), 1u);
    }
    EXPECT_EQ(get(sec.rec.noCoords), 4u);
    EXPECT_EQ(sec.rec.coords[2][3], 6.0);
    EXPECT_EQ(get(sec.rec.noSel), 7u);
    EXPECT_EQ(sec.rec.sel[6], 15.0);
    EXPECT_EQ(sec.rec.prc[5][0], 5.0);
}

TEST(XsecObject, MalformedDataBlocksMakeTheCrossSectionInvalid) {
    const std::vector<std::vector<Rec>> bad = {
        {doubles(column(3, 0)), doubles(column(3, 0))},                              // two records
        {doubles(column(3, 0)), doubles(column(2, 0)), doubles(column(3, 0))},       // counts differ
        {doubles(column(3, 0)), text("abc"), doubles(column(3, 0))},                 // bytes, not doubles
        {doubles(column(3, 0)), doubles(column(3, 0)), doubles(column(3, 0)), doubles(column(3, 0)),
         doubles(column(3, 0)), doubles(column(3, 0))},                              // marks as doubles
    };
    for (size_t k = 0; k < bad.size(); ++k) {
        CTDxSec sec("a", 1, "b");
        ASSERT_EQ(sec.setCount(XsecSet::Raw, 2), 1u);
        double* before = sec.rec.raw[0];
        List block(bad[k]);
        EXPECT_EQ(sec.takeRecords(XsecSet::Raw, block.head), 0u) << "block " << k;
        EXPECT_EQ(sec.publicRecord(), nullptr);
        // The arrays are left as they were, and the object stays invalid.
        EXPECT_EQ(get(sec.rec.raw[0]), before);
        EXPECT_EQ(get(sec.rec.noRaw), 2u);
        List good({doubles(column(1, 0))});
        EXPECT_EQ(sec.takeRecords(XsecSet::Sel, good.head), 0u);
        EXPECT_EQ(sec.setCount(XsecSet::Sel, 1), 0u);
    }
    CTDxSec sec("a", 1, "b");
    List tooMany({doubles(column(1, 0)), doubles(column(1, 0))});
    EXPECT_EQ(sec.takeRecords(XsecSet::Sel, tooMany.head), 0u);
}

TEST(XsecObject, HeaderLayoutFollowsVersionAndKeyShape) {
    const std::vector<uint16_t> fileWords = ramp(25, 500);
    const std::vector<double> fileValues = column(23, 1000);
    struct Case {
        uint32_t version;
        bool fourKeys;
        int words;
        int values;
    };
    const Case cases[] = {{106, false, 25, 23}, {105, true, 25, 23}, {104, false, 24, 15}, {104, true, 24, 15},
                          {103, false, 23, 9},  {103, true, 23, 10}, {102, false, 21, 9},  {102, true, 21, 10},
                          {101, false, 16, 9},  {101, true, 20, 10}, {90, true, 20, 10}};
    for (const Case& c : cases) {
        std::vector<Rec> keys{text("p"), doubles({2.5}), text("s")};
        if (c.fourKeys) keys.push_back(text("extra"));
        List key(keys);
        List header({words(fileWords), doubles(fileValues)});
        CTDxSec sec(key.head, header.head, c.version);
        ASSERT_EQ(sec.validFlag, 1u) << c.version;
        EXPECT_STREQ(sec.rec.primaryName, "p");
        EXPECT_STREQ(sec.rec.secondaryName, "s");
        EXPECT_STREQ(sec.rec.extraName, c.fourKeys ? "extra" : " ");
        EXPECT_EQ(get(sec.rec.keyValue), 2.5);
        for (int i = 0; i < c.words; ++i) EXPECT_EQ(sec.rec.headerWords[i], fileWords[i]) << c.version;
        for (int i = 0; i < c.values; ++i) EXPECT_EQ(get(sec.rec.headerValues[i]), fileValues[i]) << c.version;
        expectDefaultHeader(&sec.rec, c.words, c.values);
    }

    // Records shorter than the layout are copied as far as they go.
    List key({text("p"), doubles({1}), text("s"), text("e")});
    List shortHeader({words({7, 8}), doubles({3.0})});
    CTDxSec sec(key.head, shortHeader.head, 106);
    ASSERT_EQ(sec.validFlag, 1u);
    EXPECT_EQ(sec.rec.headerWords[1], 8);
    EXPECT_EQ(get(sec.rec.headerValues[0]), 3.0);
    expectDefaultHeader(&sec.rec, 2, 1);
}

TEST(XsecObject, MalformedKeyOrHeaderBlocksGiveAnInvalidObject) {
    List header({words(ramp(25, 0)), doubles(column(23, 0))});
    List fiveKeys({text("p"), doubles({1}), text("s"), text("e"), text("x")});
    List twoKeys({text("p"), doubles({1})});
    List shortValue({text("p"), text("1234"), text("s")});
    EXPECT_EQ(CTDxSec(fiveKeys.head, header.head, 106).validFlag, 0u);
    EXPECT_EQ(CTDxSec(twoKeys.head, header.head, 106).validFlag, 0u);
    EXPECT_EQ(CTDxSec(shortValue.head, header.head, 106).validFlag, 0u);
    EXPECT_EQ(CTDxSec(nullptr, header.head, 106).validFlag, 0u);

    List key({text("p"), doubles({1}), text("s")});
    List oneRecord({words(ramp(25, 0))});
    List threeRecords({words(ramp(25, 0)), doubles(column(23, 0)), doubles({1})});
    EXPECT_EQ(CTDxSec(key.head, oneRecord.head, 106).validFlag, 0u);
    EXPECT_EQ(CTDxSec(key.head, threeRecords.head, 106).validFlag, 0u);
    EXPECT_EQ(CTDxSec(key.head, nullptr, 106).validFlag, 0u);

    // The key value is the first 8 bytes of its record, whatever its type.
    List wideKey({text("p"), text(std::string("\0\0\0\0\0\0\xf0?-tail", 13)), text("s")});
    CTDxSec wide(wideKey.head, header.head, 106);
    ASSERT_EQ(wide.validFlag, 1u);
    EXPECT_EQ(get(wide.rec.keyValue), 1.0);
}
