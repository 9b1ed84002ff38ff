// VRE files on disk: the exact record sequence written, round trips, the
// writer's handling of unset and resized items, version-100 files, open
// failures, and damaged or hostile files, which must never crash.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "common/testutil.h"
#include "rcf/rcf_internal.h"
#include "vre/vre_test.h"

using vretest::create;
using vretest::unitSeq;
using vretest::Vre;

namespace {

uint32_t tagOf(const char* text) {
    uint32_t tag = 0;
    std::memcpy(&tag, text, 4);
    return tag;
}
template <uint32_t Version>
uint32_t ident(uint32_t* version) {
    *version = Version;
    return tagOf("VRE_");
}
uint32_t identGrd(uint32_t* version) {
    *version = 206;
    return tagOf("GRD_");
}

int32_t storageUnit(CVreHandle* h, int32_t index) {
    int32_t unit = -1;
    if (index < 0) vreGetScalarItemUnitInfo(h, -index - 1, nullptr, &unit, nullptr, nullptr);
    if (index >= 0) vreGetVectorItemUnitInfo(h, index, nullptr, &unit, nullptr, nullptr);
    return unit;
}

// Everything a handle holds, as the API gives it.
struct Snapshot {
    std::array<int32_t, VRE_SIZE_PARAMS> params{};
    std::vector<std::string> names;
    std::vector<int32_t> panelCounts;
    std::array<int32_t, 2> symmetry{};
    std::array<double, 2> scalars{};
    std::array<int32_t, 2 + VRE_VECTOR_ITEMS> units{};  // scalars, then vector items
    std::array<int32_t, VRE_VECTOR_ITEMS> status{};
    std::array<std::vector<double>, VRE_VECTOR_ITEMS> items;
    bool operator==(const Snapshot&) const = default;
};

Snapshot snapshot(CVreHandle* h) {
    Snapshot s;
    for (int32_t i = 0; i < VRE_SIZE_PARAMS; ++i) s.params[static_cast<size_t>(i)] = vreGetVectorParam(h, i);
    // A damaged file may claim any body count: ask only for what a caller could hold.
    if (s.params[1] >= 0 && s.params[1] <= (1 << 16)) {
        s.names = vretest::bodyNames(h);
        s.panelCounts = vretest::panelCounts(h);
    }
    vreGetSymmetry(h, &s.symmetry[0], &s.symmetry[1]);
    for (int32_t i = 0; i < 2; ++i) s.scalars[static_cast<size_t>(i)] = vreGetScalarItem(h, i);
    for (int32_t i = -2; i < VRE_VECTOR_ITEMS; ++i) s.units[static_cast<size_t>(i + 2)] = storageUnit(h, i);
    for (size_t i = 0; i < VRE_VECTOR_ITEMS; ++i) s.items[i] = vretest::vectorItem(h, int32_t(i), &s.status[i]);
    return s;
}

// Every member set: N0 1, B 2 with 1 and 2 panels (P 3), N3 2, N4 2, N7 2,
// size parameter 5 = 55 and 6 = n6; item 5 stored in its quantity's second unit.
Vre makeFull(int32_t n6) {
    Vre h = create();
    const int32_t params[VRE_SIZE_PARAMS] = {1, 2, 0, 2, 2, 55, n6, 2};
    for (int32_t i = 0; i < VRE_SIZE_PARAMS; ++i) vreSetVectorParam(h.get(), i, params[i]);
    const int32_t counts[2] = {1, 2};
    vreSetBodyPanelCount(h.get(), counts);
    vreSetBodyNames(h.get(), vretest::packNames({"alpha", "beta"}).data());
    vreSetSymmetry(h.get(), 0, 1);
    vreSetScalarItem(h.get(), 0, 9.81);
    vreSetScalarItem(h.get(), 1, 1025.0);
    vreSetVectorItemUnit(h.get(), 5, unitSeq(100514, 2));
    std::vector<double> values(64);
    for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
        for (size_t j = 0; j < values.size(); ++j) values[j] = i * 1000.0 + static_cast<double>(j) + 0.25;
        values[1] = VRE_DELETE_VALUE;
        vreSetVectorItem(h.get(), i, values.data());
    }
    return h;
}

// A record met when walking a file: type, count, and the value of a
// one-element integer record (else kAny).
using Rec = std::array<int64_t, 3>;
constexpr int64_t kAny = INT64_MIN;

std::vector<Rec> walk(const std::string& path) {
    std::vector<Rec> recs;
    FileHandle f = nullptr;
    uint32_t tag = 0;
    if (rcfFileOpenRead(path.c_str(), &f, ident<101>, &tag) != 0) return recs;
    uint32_t count = 0;
    for (int32_t type; (type = rcfQuery(f, &count)) != 0;) {
        int32_t value = 0;
        if (type == RCF_INT4 && count == 1 && rcfLrecRead(f, RCF_INT4, 1, &value) == 1) {
            recs.push_back({type, count, value});
        } else {
            rcfSkip(f);
            recs.push_back({type, count, kAny});
        }
    }
    rcfFileClose(&f);
    return recs;
}

// The version-101 record sequence of a handle made by makeFull.
std::vector<Rec> expectedRecords(CVreHandle* h) {
    const auto sizes = vretest::expectedSizes(1, 2, 3, 2, 2, 2);
    std::vector<Rec> recs;
    auto num = [&](int64_t v) { recs.push_back({RCF_INT4, 1, v}); };
    auto group = [&](int32_t i, int64_t count) {
        num(i < 0 ? -i - 1 : i);
        num(storageUnit(h, i));
        recs.push_back({RCF_DOUBLE, count, kAny});
    };
    auto groups = [&](int32_t first, int32_t last) {
        for (int32_t i = first; i <= last; ++i) group(i, sizes[static_cast<size_t>(i)]);
    };
    num(1);
    groups(0, 0);
    num(55);
    num(2);
    recs.push_back({RCF_BYTE, 2 * VRE_NAME_LENGTH, kAny});
    groups(16, 20);
    recs.push_back({RCF_INT4, 2, kAny});
    num(2);
    recs.push_back({RCF_INT4, 2, kAny});
    groups(1, 4);
    num(2);
    group(-1, 1);
    group(-2, 1);
    groups(5, 15);
    num(vreGetVectorParam(h, 6));
    if (vreGetVectorParam(h, 6) == 1) {
        num(2);
        groups(21, 22);
    }
    return recs;
}

std::vector<double> groupValues(int32_t index, size_t count) {
    std::vector<double> v(count);
    for (size_t j = 0; j < count; ++j) v[j] = index * 10 + static_cast<double>(j) + 0.5;
    return v;
}

// Writes record files by hand, for formats and damage the writer never makes.
class RawFile {
public:
    RawFile(const std::string& path, rcfAppIdent id) { EXPECT_EQ(rcfFileOpenCreate(path.c_str(), "", &f_, id, 0), 0); }
    ~RawFile() { rcfFileClose(&f_); }
    RawFile& ints(std::vector<int32_t> v) { return put(RCF_INT4, v); }
    RawFile& num(int32_t v) { return ints({v}); }
    RawFile& doubles(std::vector<double> v) { return put(RCF_DOUBLE, v); }
    RawFile& group(int32_t index, int32_t unit, size_t count) {
        return num(index).num(unit).doubles(groupValues(index, count));
    }

private:
    template <class T>
    RawFile& put(int32_t type, std::vector<T>& v) {
        rcfLrecWrite(f_, type, static_cast<uint32_t>(v.size()), v.data());
        return *this;
    }
    FileHandle f_ = nullptr;
};

Vre readBack(const std::string& path, int32_t expectedStatus = 0) {
    VreHandle raw = nullptr;
    EXPECT_EQ(vreFileRead(path.c_str(), &raw), expectedStatus) << path;
    EXPECT_NE(raw, nullptr);  // the caller's to free whatever the status
    return Vre(raw);
}

}  // namespace

TEST(VreFile, RecordSequenceAndRoundTrip) {
    testutil::TempDir dir;
    for (int32_t n6 : {1, 0}) {
        const std::string path = dir.file("full" + std::to_string(n6) + ".vre");
        Vre h = makeFull(n6);
        ASSERT_EQ(vreFileWrite(path.c_str(), h.get()), 0);
        EXPECT_EQ(walk(path), expectedRecords(h.get())) << "n6 = " << n6;
        const auto bytes = testutil::readBytes(path);
        ASSERT_GT(bytes.size(), 113u);
        EXPECT_EQ(std::string(bytes.begin() + 4, bytes.begin() + 8), "VRE_");
        EXPECT_EQ(bytes[64], 0x1A);  // no application text in the file header

        Snapshot expected = snapshot(h.get());
        EXPECT_NE(expected.units[2 + 5], unitSeq(100514, 1));
        if (n6 != 1) {  // items 21, 22 and N7 are not in the file
            expected.params[7] = 0;
            expected.status[21] = expected.status[22] = VRE_NOT_SET;
            expected.items[21].clear();
            expected.items[22].clear();
        }
        EXPECT_EQ(snapshot(readBack(path).get()), expected) << "n6 = " << n6;
    }
}

TEST(VreFile, WriterMakesMissingBuffersAndFitsResizedOnes) {
    testutil::TempDir dir;
    const std::string path = dir.file("fitted.vre");
    Vre h = create();
    vreSetVectorParam(h.get(), 1, 1);
    vreSetBodyNames(h.get(), vretest::packNames({"one"}).data());
    const double v16[1] = {16.0};
    vreSetVectorItem(h.get(), 16, v16);
    vreSetVectorParam(h.get(), 0, 2);
    const std::vector<double> v0(24, 3.0);
    vreSetVectorItem(h.get(), 0, v0.data());
    vreSetVectorParam(h.get(), 1, 2);  // the body buffers hold one body
    vreSetVectorParam(h.get(), 0, 1);  // item 0 holds 24 values, the file 12
    const int32_t counts[2] = {4, 0};
    vreSetBodyPanelCount(h.get(), counts);  // a new buffer, for both bodies
    ASSERT_EQ(vreFileWrite(path.c_str(), h.get()), 0);

    Vre back = readBack(path);
    EXPECT_EQ(vretest::bodyNames(back.get()), (std::vector<std::string>{"one", ""}));
    EXPECT_EQ(vretest::vectorItem(back.get(), 16), (std::vector<double>{16.0, 0.0}));
    EXPECT_EQ(vretest::vectorItem(back.get(), 0), std::vector<double>(12, 3.0));
    EXPECT_EQ(vretest::vectorItem(back.get(), 1), std::vector<double>(12, 0.0));  // never set
    EXPECT_EQ(vreGetVectorParam(back.get(), 2), 4);
    int32_t status = -1;  // N3 = 0: present but empty
    EXPECT_TRUE(vretest::vectorItem(back.get(), 8, &status).empty());
    EXPECT_EQ(status, 0);
}

TEST(VreFile, WriteFailuresLeaveExistingFilesAlone) {
    testutil::TempDir dir;
    const std::string path = dir.file("keep.vre");
    Vre good = makeFull(1);
    ASSERT_EQ(vreFileWrite(path.c_str(), good.get()), 0);
    const auto before = testutil::readBytes(path);
    Vre bad = create();
    vreSetVectorParam(bad.get(), 3, -4);
    EXPECT_EQ(vreFileWrite(path.c_str(), bad.get()), F_ERR_MEMORY);
    vreSetVectorParam(bad.get(), 3, 1 << 16);
    vreSetVectorParam(bad.get(), 4, 1 << 16);  // N4 * N3 * N3 = 2^48
    EXPECT_EQ(vreFileWrite(path.c_str(), bad.get()), F_ERR_MEMORY);
    EXPECT_EQ(testutil::readBytes(path), before);
    EXPECT_EQ(vreFileWrite(dir.file("no/such/dir.vre").c_str(), good.get()), F_ERR_OPEN);
    EXPECT_EQ(vreFileWrite(nullptr, good.get()), F_ERR_ARGUMENT);
}

TEST(VreFile, ReadsVersion100Files) {
    testutil::TempDir dir;
    const std::string path = dir.file("old.vre");
    const int32_t second = unitSeq(100514, 2), foreign = unitSeq(110250, 1);
    ASSERT_FALSE(qtyItemUnitEqv(100514, foreign));
    const auto sizes = vretest::expectedSizes(1, 1, 2, 1, 1, 0);  // N0 1, B 1 with 2 panels, N3 1, N4 1
    {
        RawFile f(path, ident<100>);
        f.num(1).group(0, unitSeq(100514, 1), 12).num(1).ints({2, 3}).num(1).ints({2});
        f.group(1, second, 6).group(2, 0, 2).group(3, foreign, 6).group(4, 0, 2).num(1);
        f.num(0).num(0).doubles({9.5}).num(1).num(0).doubles({-2.0});
        for (int32_t i = 5; i <= 15; ++i) f.group(i, 0, static_cast<size_t>(sizes[static_cast<size_t>(i)]));
    }
    Vre h = readBack(path);
    const Snapshot s = snapshot(h.get());
    EXPECT_EQ(s.params, (std::array<int32_t, 8>{1, 1, 2, 1, 1, 0, 0, 0}));
    EXPECT_EQ(s.symmetry, (std::array<int32_t, 2>{2, 3}));
    EXPECT_EQ(s.panelCounts, std::vector<int32_t>{2});
    EXPECT_EQ(s.scalars, (std::array<double, 2>{9.5, -2.0}));
    EXPECT_TRUE(s.names.empty());  // never in a version-100 file
    for (size_t i = 0; i <= 15; ++i) EXPECT_EQ(s.items[i], groupValues(int32_t(i), size_t(sizes[i]))) << i;
    for (size_t i = 16; i <= 22; ++i) EXPECT_EQ(s.status[i], VRE_NOT_SET) << i;
    // A unit of the item's quantity is taken; one of another quantity is not.
    EXPECT_EQ(s.units[2 + 1], second);
    EXPECT_EQ(s.units[2 + 3], unitSeq(100514, 1));
}

TEST(VreFile, OpenFailuresAndUnknownVersions) {
    testutil::TempDir dir;
    EXPECT_EQ(vreGetScalarItem(readBack(dir.file("missing.vre"), F_ERR_OPEN).get(), 0), 9.80665);
    const std::string grd = dir.file("data.grd");
    RawFile(grd, identGrd).num(1);
    readBack(grd, F_ERR_APP_TAG);
    // Another format version is not read at all.
    const std::string future = dir.file("future.vre");
    RawFile(future, ident<102>).num(5).group(0, 0, 60);
    EXPECT_EQ(snapshot(readBack(future).get()), snapshot(create().get()));
    EXPECT_EQ(vreFileRead(future.c_str(), nullptr), F_ERR_ARGUMENT);
}

TEST(VreFile, HostileSizesAndRecordsStopTheRead) {
    testutil::TempDir dir;
    const std::string path = dir.file("hostile.vre");
    // 12 * N0 fits in 32 bits but not in the file: item 0 is never made.
    RawFile(path, ident<100>).num(INT32_MAX / 12).group(0, 0, 3).num(1);
    Vre a = readBack(path);
    EXPECT_EQ(vreGetVectorParam(a.get(), 0), INT32_MAX / 12);
    EXPECT_EQ(vreGetVectorSize(a.get(), 0), 0);
    EXPECT_EQ(vreGetVectorParam(a.get(), 1), 0);  // reading stopped there

    // A values record longer than the parameters allow is refused.
    RawFile(path, ident<100>).num(1).group(0, 0, 13).num(4);
    Vre b = readBack(path);
    EXPECT_EQ(vretest::vectorItem(b.get(), 0), std::vector<double>(12, 0.0));
    EXPECT_EQ(vreGetVectorParam(b.get(), 1), 0);

    // Negative panel counts give a negative P: no P-sized item is made.
    RawFile(path, ident<100>).num(0).num(0).num(0).num(2).ints({0, 0}).num(0).ints({-5, 1}).group(1, 0, 3);
    Vre c = readBack(path);
    EXPECT_EQ(vreGetVectorParam(c.get(), 2), -4);
    EXPECT_EQ(vreGetVectorSize(c.get(), 1), 0);

    // A record of another type where a size parameter belongs.
    RawFile(path, ident<100>).doubles({1.0}).num(3);
    EXPECT_EQ(snapshot(readBack(path).get()), snapshot(create().get()));
}

TEST(VreFile, TruncatedAndCorruptedFilesNeverCrash) {
    testutil::TempDir dir;
    const std::string full = dir.file("full.vre"), bad = dir.file("bad.vre");
    Vre h = makeFull(1);
    ASSERT_EQ(vreFileWrite(full.c_str(), h.get()), 0);
    const auto bytes = testutil::readBytes(full);
    const Snapshot expected = snapshot(h.get());

    int32_t itemsBefore = 0;
    for (size_t len = 0; len < bytes.size(); ++len) {
        testutil::writeBytes(bad, std::vector<uint8_t>(bytes.begin(), bytes.begin() + static_cast<long>(len)));
        VreHandle raw = nullptr;
        const int32_t status = vreFileRead(bad.c_str(), &raw);
        const Vre back(raw);
        ASSERT_NE(raw, nullptr);
        EXPECT_TRUE(len < 113 ? status != 0 : status == 0) << len;
        const Snapshot s = snapshot(back.get());
        const int32_t items = static_cast<int32_t>(std::count(s.status.begin(), s.status.end(), 0));
        EXPECT_GE(items, itemsBefore) << len;  // a longer prefix never yields less
        itemsBefore = items;
        if (len + 1 == bytes.size()) {
            for (size_t i = 0; i < 22; ++i) EXPECT_EQ(s.items[i], expected.items[i]) << i;
        }
    }

    for (size_t at = 113; at < bytes.size(); ++at) {
        for (uint8_t value : {uint8_t{0x00}, uint8_t{0x7F}, uint8_t{0xFF}}) {
            auto damaged = bytes;
            damaged[at] = value;
            testutil::writeBytes(bad, damaged);
            Vre back = readBack(bad);
            const Snapshot s = snapshot(back.get());
            // What was read stays usable: each buffer keeps its length.
            for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
                if (s.status[static_cast<size_t>(i)] != 0) continue;
                std::vector<double> values(static_cast<size_t>(vreGetVectorSize(back.get(), i)) + 1);
                EXPECT_EQ(vreSetVectorItem(back.get(), i, values.data()), 0);
            }
        }
    }
}
