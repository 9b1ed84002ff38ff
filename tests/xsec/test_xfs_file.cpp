// Cross-section files: round trips, table order, find and walk semantics,
// older file layouts, malformed and truncated files, and handles misused by
// callers.
#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <random>
#include <tuple>

#include "common/testutil.h"
#include "xfs_testutil.h"

using namespace xfstest;

namespace {

std::string keyOf(const XsecData* x) {
    if (x == nullptr) return "null";
    return std::string(x->primaryName) + "/" + x->secondaryName + "/" + std::to_string(x->keyValue) + "/" +
           x->extraName;
}

// Keys in the order the cursor yields them, until the end of the table.
std::vector<std::string> drain(XsecTableHandle table, XsecCursor cursor, size_t limit = 100) {
    std::vector<std::string> out;
    for (size_t i = 0; i < limit; ++i) {
        if (cursor->pos == xsecTableResolve(table)->list.end()) break;
        out.push_back(keyOf(xfsXsecFindNext(table, cursor)));
    }
    return out;
}

std::vector<std::string> keys(std::initializer_list<const char*> list) { return {list.begin(), list.end()}; }

// Seven cross sections in no particular order; three share one key.
void writeMixed(const std::string& path) {
    Owned owned;
    owned.add("river", 2, "r", "e1");
    owned.add("B", 0, "x");
    owned.add("a", 9, "x");
    owned.add("river", 2, "R", "e2");
    owned.add("A", 1, "x");
    owned.add("a", 9, "w");
    owned.add("RIVER", 2, "r", "e3");
    owned.add("zeta", 0, "z");
    writeFile(path, owned.all);
}

const std::vector<std::string> kMixedSorted = keys({"a/w/9.000000/ ", "A/x/1.000000/ ", "a/x/9.000000/ ",
                                                    "B/x/0.000000/ ", "river/r/2.000000/e1", "river/R/2.000000/e2",
                                                    "RIVER/r/2.000000/e3", "zeta/z/0.000000/ "});

}  // namespace

TEST(XfsFile, TableVersionIsThatOfTheFileLoadedLast) {
    if (!loadedOnce()) {
        EXPECT_EQ(xfsXsecTableVersion(nullptr), 100);
    }
    testutil::TempDir dir;
    {
        RawFile old(dir.file("old.xfs"), 104);
        old.key("p", 1, "s");
        old.header({1, 2}, {3.0});
    }
    Owned owned;
    owned.add("p", 1, "s");
    writeFile(dir.file("new.xfs"), owned.all);

    Table oldTable(dir.file("old.xfs"));
    ASSERT_EQ(oldTable.status, 0);
    EXPECT_EQ(xfsXsecTableVersion(oldTable.h), 104);
    Table newTable(dir.file("new.xfs"));
    ASSERT_EQ(newTable.status, 0);
    // The version is process-wide, whatever handle is given.
    EXPECT_EQ(xfsXsecTableVersion(oldTable.h), 106);
    EXPECT_EQ(xfsXsecTableVersion(nullptr), 106);
    // A failed open leaves it.
    Table missing(dir.file("absent.xfs"));
    EXPECT_EQ(missing.status, F_ERR_OPEN);
    EXPECT_EQ(xfsXsecTableVersion(nullptr), 106);
}

TEST(XfsFile, CrossSectionsRoundTripWithEveryDataSet) {
    testutil::TempDir dir;
    Owned owned;
    XsecHandle a = owned.add("Alpha", 1.25, "main", "km 1.2");
    fillAll(a, 1);
    for (int i = 0; i < 25; ++i) a->headerWords[i] = static_cast<uint16_t>(60000 + i);
    for (int i = 0; i < 23; ++i) a->headerValues[i] = -0.5 * i;
    XsecHandle b = owned.add("beta", -3, "side");
    fillAll(b, 2, 1, 1, 1, 1);
    XsecHandle c = owned.add("gamma", 1e300, "x");
    ASSERT_EQ(xfsXsecSetNoSel(c, 3), 1);
    c->sel[2] = 42.0;
    // An empty primary name and an empty extra name survive too.
    XsecHandle d = owned.add("", 7, "");
    std::free(d->extraName);
    d->extraName = static_cast<char*>(std::calloc(1, 1));
    // A set larger than the set-count operations can make, filled by hand.
    XsecHandle e = owned.add("epsilon", 0, "big");
    e->noSel = 70000;
    e->sel = static_cast<double*>(std::malloc(70000 * sizeof(double)));
    for (uint32_t i = 0; i < 70000; ++i) e->sel[i] = i;
    writeFile(dir.file("all.xfs"), owned.all);

    Table t(dir.file("all.xfs"));
    ASSERT_EQ(t.status, 0);
    for (XsecHandle x : owned.all) {
        XsecCursor cursor = nullptr;
        XsecHandle loaded = xfsXsecFind(t.h, x->primaryName, x->keyValue, x->secondaryName, &cursor);
        expectSameRecord(x, loaded);
        if (loaded != nullptr) {
            EXPECT_EQ(get(loaded->owner), static_cast<void*>(xsecResolve(loaded)));
        }
    }
    // The header block of the first cross section follows its key block of
    // 3 + (5 + 5) + (5 + 8) + (5 + 4) + (5 + 6) + 1 bytes, written at the
    // application base 113.
    XsecCursor cursor = nullptr;
    XsecHandle first = xfsXsecFind(t.h, "alpha", 1.25, "MAIN", &cursor);
    ASSERT_NE(first, nullptr);
    EXPECT_EQ(xsecResolve(first)->blockPosition, 113u + 47u);
}

TEST(XfsFile, ACrossSectionWithoutDataIsKeyAndHeaderBlocksOnly) {
    testutil::TempDir dir;
    Owned owned;
    XsecHandle x = owned.add("a", 1, "b");
    ASSERT_EQ(xfsXsecSetNoRaw(x, 3), 1);
    ASSERT_EQ(xfsXsecSetNoRaw(x, 0), 1);
    writeFile(dir.file("plain.xfs"), owned.all);
    const auto bytes = testutil::readBytes(dir.file("plain.xfs"));
    // Key block: 3 + (5+1) + (5+8) + (5+1) + (5+1) + 1; header block: 3 + (5+50) + (5+184) + 1.
    ASSERT_EQ(bytes.size(), 113u + 35u + 248u);
    EXPECT_EQ(bytes[113], 0xFE);
    EXPECT_EQ(bytes[114] | bytes[115] << 8, 257);
    EXPECT_EQ(bytes[113 + 35], 0xFE);
    EXPECT_EQ(bytes[114 + 35] | bytes[115 + 35] << 8, 258);
    EXPECT_EQ(bytes.back(), 0xFF);
}

TEST(XfsFile, TablesAreSortedByNamesThenValueAndStableForEqualKeys) {
    testutil::TempDir dir;
    writeMixed(dir.file("mixed.xfs"));
    Table t(dir.file("mixed.xfs"));
    ASSERT_EQ(t.status, 0);
    EXPECT_EQ(walk(t.h), kMixedSorted);

    // Descending and ascending files both load ascending.
    Owned owned;
    for (int i = 9; i >= 0; --i) owned.add("s", i, "t");
    writeFile(dir.file("down.xfs"), owned.all);
    std::reverse(owned.all.begin(), owned.all.end());
    writeFile(dir.file("up.xfs"), owned.all);
    for (const char* name : {"down.xfs", "up.xfs"}) {
        Table sorted(dir.file(name));
        ASSERT_EQ(sorted.status, 0);
        std::vector<std::string> expected;
        for (int i = 0; i <= 9; ++i) expected.push_back("s/t/" + std::to_string(double(i)) + "/ ");
        EXPECT_EQ(walk(sorted.h), expected) << name;
    }
}

TEST(XfsFile, ARandomOrderFileLoadsAsAStableSortOfIt) {
    testutil::TempDir dir;
    const char* primaries[] = {"a", "A", "b", "B", "c"};
    const char* secondaries[] = {"x", "X"};
    std::mt19937 random(99);
    Owned owned;
    for (int i = 0; i < 3000; ++i) {
        owned.add(primaries[random() % 5], static_cast<double>(random() % 10), secondaries[random() % 2],
                  std::to_string(i).c_str());
    }
    writeFile(dir.file("random.xfs"), owned.all);
    std::vector<XsecHandle> expected = owned.all;
    std::stable_sort(expected.begin(), expected.end(), [](XsecHandle a, XsecHandle b) {
        return xsecKeyOrder(a->primaryName, a->secondaryName, a->keyValue, b->primaryName, b->secondaryName,
                            b->keyValue) < 0;
    });
    Table t(dir.file("random.xfs"));
    ASSERT_EQ(t.status, 0);
    std::vector<std::string> want;
    for (XsecHandle x : expected) want.push_back(keyOf(x));
    EXPECT_EQ(walk(t.h), want);
}

TEST(XfsFile, FindReturnsTheFirstMatchAndFindNextWalksOnWithoutComparing) {
    testutil::TempDir dir;
    writeMixed(dir.file("mixed.xfs"));
    Table t(dir.file("mixed.xfs"));
    ASSERT_EQ(t.status, 0);

    XsecCursor cursor = nullptr;
    EXPECT_EQ(keyOf(xfsXsecFind(t.h, "River", 2, "r", &cursor)), "river/r/2.000000/e1");
    EXPECT_EQ(drain(t.h, cursor), keys({"river/R/2.000000/e2", "RIVER/r/2.000000/e3", "zeta/z/0.000000/ "}));
    EXPECT_EQ(xfsXsecFindNext(t.h, cursor), nullptr);

    EXPECT_EQ(keyOf(xfsXsecFind(t.h, "A", 9, "X", &cursor)), "a/x/9.000000/ ");
    EXPECT_EQ(keyOf(xfsXsecFind(t.h, "zeta", 0, "z", &cursor)), "zeta/z/0.000000/ ");
    EXPECT_EQ(xfsXsecFindNext(t.h, cursor), nullptr);

    // Absent keys: below, between and above the table's keys.
    for (auto [p, k, s] : {std::tuple{"0", 0.0, "x"}, std::tuple{"a", 8.5, "x"}, std::tuple{"zz", 0.0, "z"}}) {
        EXPECT_EQ(xfsXsecFind(t.h, p, k, s, &cursor), nullptr) << p;
        ASSERT_NE(cursor, nullptr);
        EXPECT_EQ(xfsXsecFindNext(t.h, cursor), nullptr);
    }

    // Two empty names and 0.0 walk the whole table.
    EXPECT_EQ(keyOf(xfsXsecFind(t.h, "", 0.0, "", &cursor)), kMixedSorted[0]);
    EXPECT_EQ(drain(t.h, cursor), std::vector<std::string>(kMixedSorted.begin() + 1, kMixedSorted.end()));
    EXPECT_EQ(xfsXsecFindNext(t.h, cursor), nullptr);
    // Without a cursor the find still answers.
    EXPECT_EQ(keyOf(xfsXsecFind(t.h, "b", 0, "x", nullptr)), "B/x/0.000000/ ");

    // A cursor is made even when the arguments are refused; it yields nothing.
    const size_t cursorsBefore = xsecCursors().size();
    XsecCursor refused = nullptr;
    EXPECT_EQ(xfsXsecFind(nullptr, "a", 1, "x", &refused), nullptr);
    ASSERT_NE(refused, nullptr);
    EXPECT_EQ(xfsXsecFindNext(t.h, refused), nullptr);
    EXPECT_EQ(xfsXsecFind(t.h, nullptr, 1, "x", &refused), nullptr);
    EXPECT_EQ(xfsXsecFind(t.h, "a", 1, nullptr, &refused), nullptr);
    EXPECT_EQ(xsecCursors().size(), cursorsBefore + 3);

    // An empty table: the walk finds nothing.
    FileHandle f = nullptr;
    ASSERT_EQ(xfsFileOpenCreate(dir.file("empty.xfs").c_str(), &f), 0);
    ASSERT_EQ(xfsFileClose(&f), 0);
    Table empty(dir.file("empty.xfs"));
    ASSERT_EQ(empty.status, 0);
    EXPECT_EQ(xfsXsecFind(empty.h, "", 0.0, "", &cursor), nullptr);
    EXPECT_EQ(xfsXsecFindNext(empty.h, cursor), nullptr);
    EXPECT_EQ(xfsXsecFind(empty.h, "a", 1, "b", &cursor), nullptr);
}

TEST(XfsFile, NextAndPreviousStopAtBothEndsAndStayInTheirTable) {
    testutil::TempDir dir;
    writeMixed(dir.file("mixed.xfs"));
    Table t(dir.file("mixed.xfs"));
    Table other(dir.file("mixed.xfs"));
    ASSERT_EQ(t.status, 0);
    ASSERT_EQ(other.status, 0);

    XsecHandle first = xfsXsecFind(t.h, "", 0.0, "", nullptr);
    XsecHandle last = xfsXsecFind(t.h, "zeta", 0, "z", nullptr);
    EXPECT_EQ(xfsXsecPrev(t.h, first), nullptr);
    EXPECT_EQ(xfsXsecNext(t.h, last), nullptr);

    std::vector<std::string> backwards;
    for (XsecHandle x = last; x != nullptr; x = xfsXsecPrev(t.h, x)) backwards.insert(backwards.begin(), keyOf(x));
    EXPECT_EQ(backwards, kMixedSorted);

    // A cross section of another table, or no table, has no neighbours here.
    XsecHandle foreign = xfsXsecFind(other.h, "a", 9, "x", nullptr);
    ASSERT_NE(foreign, nullptr);
    EXPECT_EQ(xfsXsecNext(t.h, foreign), nullptr);
    EXPECT_EQ(xfsXsecPrev(t.h, foreign), nullptr);
    EXPECT_EQ(xfsXsecNext(nullptr, first), nullptr);
    // A cursor of one table yields nothing on another.
    XsecCursor cursor = nullptr;
    ASSERT_NE(xfsXsecFind(other.h, "", 0.0, "", &cursor), nullptr);
    EXPECT_EQ(xfsXsecFindNext(t.h, cursor), nullptr);
    EXPECT_NE(xfsXsecFindNext(other.h, cursor), nullptr);
}

TEST(XfsFile, KeysOnlyLoadDropsEveryDataSet) {
    testutil::TempDir dir;
    Owned owned;
    fillAll(owned.add("a", 1, "b"), 1);
    fillAll(owned.add("c", 2, "d"), 2);
    writeFile(dir.file("full.xfs"), owned.all);
    Table t(dir.file("full.xfs"), XFS_LOAD_KEYS_ONLY);
    ASSERT_EQ(t.status, 0);
    int seen = 0;
    for (XsecHandle x = xfsXsecFind(t.h, "", 0.0, "", nullptr); x != nullptr; x = xfsXsecNext(t.h, x), ++seen) {
        EXPECT_EQ(get(x->noRaw) + get(x->noSel) + get(x->noPrc) + get(x->noCoords), 0u);
        EXPECT_EQ(get(x->raw[0]), nullptr);
        EXPECT_EQ(get(x->sel), nullptr);
    }
    EXPECT_EQ(seen, 2);
}

TEST(XfsFile, OlderLayoutsLoadWithTheirHeaderSizesAndThreeColumnRawBlocks) {
    testutil::TempDir dir;
    std::vector<uint16_t> w(25);
    std::vector<double> v(23);
    for (int i = 0; i < 25; ++i) w[i] = static_cast<uint16_t>(700 + i);
    for (int i = 0; i < 23; ++i) v[i] = 50.0 + i;
    {
        RawFile f(dir.file("v104.xfs"), 104);
        f.key("p", 1, "s");
        f.header(std::vector<uint16_t>(w.begin(), w.begin() + 24), std::vector<double>(v.begin(), v.begin() + 15));
        f.block(kXfsRawBlock, {doubles({1, 2}), doubles({3, 4}), doubles({5, 6})});
    }
    Table t104(dir.file("v104.xfs"));
    ASSERT_EQ(t104.status, 0);
    XsecHandle x = xfsXsecFind(t104.h, "p", 1, "s", nullptr);
    ASSERT_NE(x, nullptr);
    EXPECT_STREQ(x->extraName, " ");
    EXPECT_EQ(x->headerWords[23], 723);
    EXPECT_EQ(x->headerWords[24], 0);
    EXPECT_EQ(get(x->headerValues[14]), 64.0);
    EXPECT_EQ(get(x->headerValues[15]), 0.001);
    EXPECT_EQ(get(x->headerValues[22]), 1.0);
    ASSERT_EQ(get(x->noRaw), 2u);
    EXPECT_EQ(x->raw[2][1], 6.0);
    EXPECT_EQ(x->raw3[1], 0.0);
    EXPECT_EQ(x->rawMark[1][1], 0);

    // Version 101: the key block's shape decides how much of the header counts.
    {
        RawFile f(dir.file("v101.xfs"), 101);
        f.key("four", 1, "s", "extra");
        f.header(w, v);
        f.key("three", 1, "s");
        f.header(w, v);
    }
    Table t101(dir.file("v101.xfs"));
    ASSERT_EQ(t101.status, 0);
    EXPECT_EQ(xfsXsecTableVersion(nullptr), 101);
    XsecHandle four = xfsXsecFind(t101.h, "four", 1, "s", nullptr);
    XsecHandle three = xfsXsecFind(t101.h, "three", 1, "s", nullptr);
    ASSERT_NE(four, nullptr);
    ASSERT_NE(three, nullptr);
    EXPECT_STREQ(four->extraName, "extra");
    EXPECT_EQ(four->headerWords[19], 719);
    EXPECT_EQ(four->headerWords[20], 0);
    EXPECT_EQ(get(four->headerValues[9]), 59.0);
    EXPECT_EQ(get(four->headerValues[10]), 1.0);
    EXPECT_EQ(three->headerWords[15], 715);
    EXPECT_EQ(three->headerWords[16], 0);
    EXPECT_EQ(get(three->headerValues[8]), 58.0);
    EXPECT_EQ(get(three->headerValues[9]), 0.0);
    EXPECT_EQ(three->headerWords[23], 2);
}

TEST(XfsFile, AMalformedDataBlockInvalidatesOnlyItsCrossSection) {
    testutil::TempDir dir;
    const std::vector<uint16_t> w(25, 1);
    const std::vector<double> v(23, 1.0);
    {
        RawFile f(dir.file("bad.xfs"), 106);
        f.block(kXfsSelBlock, {doubles({1})});  // before any header: dropped
        f.key("x1", 1, "s");
        f.header(w, v);
        f.block(kXfsSelBlock, {doubles({1, 2})});
        f.block(300, {text("unknown tag")});  // dropped
        f.key("x2", 1, "s");
        f.header(w, v);
        f.block(kXfsRawBlock, {doubles({1}), doubles({1}), doubles({1}), doubles({1}), doubles({1})});
        f.key("x3", 1, "s");
        f.header(w, v);
        f.block(kXfsCoordBlock, {doubles({1, 2}), doubles({1}), doubles({1, 2})});
        f.block(kXfsSelBlock, {doubles({1})});  // to an invalid cross section: refused
        f.key("x4", 1, "s");
        f.header(w, v);
        f.block(kXfsPrcBlock, {doubles({1}), doubles({2}), doubles({3}), doubles({4}), doubles({5}), doubles({6})});
    }
    Table t(dir.file("bad.xfs"));
    ASSERT_EQ(t.status, 0);
    XsecCursor cursor = nullptr;
    XsecHandle x1 = xfsXsecFind(t.h, "", 0.0, "", &cursor);
    ASSERT_NE(x1, nullptr);
    EXPECT_EQ(get(x1->noSel), 2u);
    EXPECT_EQ(keyOf(x1), "x1/s/1.000000/ ");
    // The walk meets the two invalid cross sections as nulls.
    EXPECT_EQ(drain(t.h, cursor), keys({"null", "null", "x4/s/1.000000/ "}));
    EXPECT_EQ(xfsXsecNext(t.h, x1), nullptr);
    EXPECT_EQ(xfsXsecFind(t.h, "x2", 1, "s", nullptr), nullptr);
    EXPECT_EQ(xfsXsecFind(t.h, "x3", 1, "s", nullptr), nullptr);
    XsecHandle x4 = xfsXsecFind(t.h, "x4", 1, "s", nullptr);
    ASSERT_NE(x4, nullptr);
    EXPECT_EQ(x4->prc[5][0], 6.0);
    EXPECT_EQ(xfsXsecPrev(t.h, x4), nullptr);
}

TEST(XfsFile, AHeaderWithoutAValidKeyFailsTheLoad) {
    testutil::TempDir dir;
    const std::vector<uint16_t> w(25, 1);
    const std::vector<double> v(23, 1.0);
    {
        RawFile noKey(dir.file("nokey.xfs"), 106);
        noKey.header(w, v);
        RawFile threeRecords(dir.file("three.xfs"), 106);
        threeRecords.key("a", 1, "b");
        threeRecords.block(kXfsHeaderBlock, {words(w), doubles(v), doubles(v)});
        RawFile keyUsedTwice(dir.file("twice.xfs"), 106);
        keyUsedTwice.key("a", 1, "b");
        keyUsedTwice.header(w, v);
        keyUsedTwice.header(w, v);
    }
    for (const char* name : {"nokey.xfs", "three.xfs", "twice.xfs"}) {
        Table t(dir.file(name));
        EXPECT_EQ(t.status, F_ERR_VALUE) << name;
        EXPECT_EQ(t.h, nullptr);
    }

    // Not a cross-section file at all.
    {
        RawFile other(dir.file("other.rcf"), 106);
    }
    auto bytes = testutil::readBytes(dir.file("other.rcf"));
    bytes[4] = 'G';
    testutil::writeBytes(dir.file("other.rcf"), bytes);
    Table wrongApp(dir.file("other.rcf"));
    EXPECT_EQ(wrongApp.status, F_ERR_APP_TAG);
    testutil::writeBytes(dir.file("empty"), {});
    Table empty(dir.file("empty"));
    EXPECT_EQ(empty.status, F_ERR_READ);
    XsecTableHandle h = reinterpret_cast<XsecTableHandle>(&bytes);
    EXPECT_EQ(xfsXsecTableLoad(nullptr, &h, 0), F_ERR_ARGUMENT);
    EXPECT_EQ(h, nullptr);
    EXPECT_EQ(xfsXsecTableLoad(dir.file("other.rcf").c_str(), nullptr, 0), F_ERR_ARGUMENT);
}

TEST(XfsFile, MisusedHandlesAreAnsweredQuietly) {
    testutil::TempDir dir;
    Owned owned;
    owned.add("a", 1, "b");
    writeFile(dir.file("one.xfs"), owned.all);
    FileHandle f = nullptr;
    ASSERT_EQ(xfsFileOpenCreate(dir.file("out.xfs").c_str(), &f), 0);

    // Null, freed and foreign cross-section handles resolve to nothing. The
    // library never reads through them.
    XsecHandle freed = xfsXsecCreate("x", 1, "y");
    XsecHandle stale = freed;
    xfsXsecFree(&freed);
    XsecData foreignRecord{};
    foreignRecord.owner = &foreignRecord;
    for (XsecHandle h : {static_cast<XsecHandle>(nullptr), stale, &foreignRecord}) {
        EXPECT_EQ(xfsXsecSetNoRaw(h, 2), 0);
        EXPECT_EQ(xfsXsecSetNoSel(h, 2), 0);
        EXPECT_EQ(xfsXsecSetNoPrc(h, 2), 0);
        EXPECT_EQ(xfsXsecSetNoCoords(h, 2), 0);
        EXPECT_EQ(xfsXsecWrite(h, f), F_ERR_ARGUMENT);
        XsecHandle copy = h;
        xfsXsecFree(&copy);
        EXPECT_EQ(copy, nullptr);
    }
    xfsXsecFree(nullptr);
    EXPECT_EQ(get(foreignRecord.noRaw), 0u);

    // A record whose owner reference was cleared resolves to nothing either.
    XsecHandle x = owned.all[0];
    void* owner = x->owner;
    x->owner = nullptr;
    EXPECT_EQ(xfsXsecSetNoSel(x, 1), 0);
    EXPECT_EQ(xfsXsecWrite(x, f), F_ERR_ARGUMENT);
    x->owner = owner;
    EXPECT_EQ(xfsXsecWrite(x, nullptr), F_ERR_ARGUMENT);

    // Tables: freed, foreign and null handles; a cross section of a table is
    // not freed through xfsXsecFree.
    Table t(dir.file("one.xfs"));
    ASSERT_EQ(t.status, 0);
    XsecCursor cursor = nullptr;
    XsecHandle member = xfsXsecFind(t.h, "a", 1, "b", &cursor);
    ASSERT_NE(member, nullptr);
    XsecHandle kept = member;
    xfsXsecFree(&kept);
    EXPECT_EQ(kept, member);
    EXPECT_STREQ(member->primaryName, "a");

    XsecTableHandle staleTable = t.h;
    xfsXsecTableFree(&t.h);
    EXPECT_EQ(t.h, nullptr);
    xfsXsecTableFree(&t.h);
    xfsXsecTableFree(nullptr);
    XsecTableHandle copy = staleTable;
    xfsXsecTableFree(&copy);
    EXPECT_EQ(copy, nullptr);
    EXPECT_EQ(xfsXsecFind(staleTable, "a", 1, "b", nullptr), nullptr);
    EXPECT_EQ(xfsXsecFindNext(staleTable, cursor), nullptr);
    EXPECT_EQ(xfsXsecNext(staleTable, member), nullptr);
    auto* foreignTable = reinterpret_cast<XsecTableHandle>(&foreignRecord);
    EXPECT_EQ(xfsXsecFind(foreignTable, "", 0, "", nullptr), nullptr);
    EXPECT_EQ(xfsXsecPrev(foreignTable, owned.all[0]), nullptr);

    // A cursor of a freed table stays harmless after a new table is loaded.
    Table again(dir.file("one.xfs"));
    EXPECT_EQ(xfsXsecFindNext(again.h, cursor), nullptr);
    EXPECT_EQ(xfsXsecFindNext(again.h, reinterpret_cast<XsecCursor>(&foreignRecord)), nullptr);
    EXPECT_EQ(xfsXsecFindNext(again.h, nullptr), nullptr);
    ASSERT_EQ(xfsFileClose(&f), 0);
}

TEST(XfsFile, WriteStopsAtAFileErrorAndRefusesABrokenRecord) {
    testutil::TempDir dir;
    Owned owned;
    XsecHandle x = owned.add("a", 1, "b");
    fillAll(x, 1);
    writeFile(dir.file("one.xfs"), owned.all);
    const auto size = std::filesystem::file_size(dir.file("one.xfs"));

    // A file opened for reading refuses the write and keeps the error.
    FileHandle readOnly = nullptr;
    uint32_t tag = 0;
    ASSERT_EQ(rcfFileOpenRead(dir.file("one.xfs").c_str(), &readOnly, xfsAppIdent, &tag), 0);
    EXPECT_EQ(xfsXsecWrite(x, readOnly), F_ERR_READONLY);
    EXPECT_EQ(xfsXsecWrite(x, readOnly), F_ERR_READONLY);
    EXPECT_EQ(xfsPeekError(readOnly), F_ERR_READONLY);
    EXPECT_EQ(xfsGetError(readOnly), F_ERR_READONLY);
    EXPECT_EQ(xfsPeekError(readOnly), 0);
    ASSERT_EQ(xfsFileClose(&readOnly), 0);
    EXPECT_EQ(readOnly, nullptr);
    EXPECT_EQ(std::filesystem::file_size(dir.file("one.xfs")), size);

    // A record with a missing name or a missing required column is refused
    // before anything is written; missing raw columns 3-5 are written as zeros.
    FileHandle f = nullptr;
    ASSERT_EQ(xfsFileOpenCreate(dir.file("out.xfs").c_str(), &f), 0);
    char* name = x->secondaryName;
    x->secondaryName = nullptr;
    EXPECT_EQ(xfsXsecWrite(x, f), F_ERR_VALUE);
    x->secondaryName = name;
    double* column = x->prc[4];
    x->prc[4] = nullptr;
    EXPECT_EQ(xfsXsecWrite(x, f), F_ERR_VALUE);
    x->prc[4] = column;
    std::free(x->raw3);
    x->raw3 = nullptr;
    std::free(x->rawMark[1]);
    x->rawMark[1] = nullptr;
    EXPECT_EQ(xfsXsecWrite(x, f), 0);
    ASSERT_EQ(xfsFileClose(&f), 0);
    Table t(dir.file("out.xfs"));
    ASSERT_EQ(t.status, 0);
    XsecHandle loaded = xfsXsecFind(t.h, "a", 1, "b", nullptr);
    ASSERT_NE(loaded, nullptr);
    EXPECT_EQ(get(loaded->noRaw), get(x->noRaw));
    EXPECT_EQ(loaded->raw[1][2], x->raw[1][2]);
    EXPECT_EQ(loaded->raw3[2], 0.0);
    EXPECT_EQ(loaded->rawMark[0][2], x->rawMark[0][2]);
    EXPECT_EQ(loaded->rawMark[1][2], 0);
}

TEST(XfsFile, TruncatedAndCorruptedFilesNeverCrashTheLoader) {
    testutil::TempDir dir;
    Owned owned;
    fillAll(owned.add("a", 1, "b", "e"), 1, 3, 2, 2, 2);
    fillAll(owned.add("c", 2, "d"), 2, 2, 1, 1, 1);
    writeFile(dir.file("good.xfs"), owned.all);
    const auto good = testutil::readBytes(dir.file("good.xfs"));
    const std::string path = dir.file("bad.xfs");

    auto loadAndWalk = [&](const std::vector<uint8_t>& bytes) {
        testutil::writeBytes(path, bytes);
        Table t(path);
        if (t.status != 0) {
            EXPECT_EQ(t.h, nullptr);
            return t.status;
        }
        EXPECT_NE(t.h, nullptr);
        XsecCursor cursor = nullptr;
        xfsXsecFind(t.h, "", 0.0, "", &cursor);
        while (cursor->pos != xsecTableResolve(t.h)->list.end()) xfsXsecFindNext(t.h, cursor);
        return 0;
    };

    for (size_t cut = 0; cut < good.size(); ++cut) {
        const int32_t status = loadAndWalk(std::vector<uint8_t>(good.begin(), good.begin() + cut));
        // A cut inside the last block is reported, not taken for the end.
        if (cut > good.size() - 40) {
            EXPECT_NE(status, 0) << "cut at " << cut;
        }
    }
    for (size_t at = 0; at < good.size(); ++at) {
        for (uint8_t pattern : {0x7F, 0xFF}) {
            auto bytes = good;
            bytes[at] ^= pattern;
            loadAndWalk(bytes);
        }
    }

    // A record that claims far more elements than the file holds.
    auto huge = good;
    const size_t firstRecordOfRawBlock = 113 + 35 + 248 + 3;  // after key, header and the raw block start
    ASSERT_EQ(huge[firstRecordOfRawBlock], RCF_DOUBLE);
    for (int i = 1; i <= 4; ++i) huge[firstRecordOfRawBlock + i] = 0x7F;
    EXPECT_NE(loadAndWalk(huge), 0);
}
