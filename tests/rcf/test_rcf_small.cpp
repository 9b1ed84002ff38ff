// The short ways of small records: written with their header in one stream
// call, headers taken byte by byte from the stream buffer, small records read
// without asking for the file's length. Same bytes and same errors as the
// long ways, including reads right after writes and after deferred skips.
#include <cstring>
#include <string>
#include <vector>

#include "rcf_testutil.h"

namespace {

using rcftest::File;
using rcftest::le32;
using rcftest::testApp;
using testutil::TempDir;

TEST(RcfSmallRecords, BytesOnDiskAreTheSameEitherSideOfTheThreshold) {
    TempDir dir;
    const std::string path = dir.file("small.rcf");
    std::vector<float> values(17);
    for (size_t i = 0; i < values.size(); ++i) values[i] = static_cast<float>(i) + 0.5f;
    uint32_t appBase = 0;
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "t", f.out(), testApp, 0), 0);
        appBase = rcfGetAppBase(f);
        ASSERT_EQ(rcfLrecWrite(f, RCF_FLOAT, 16, values.data()), 0);  // 64 bytes: one call
        ASSERT_EQ(rcfLrecWrite(f, RCF_FLOAT, 17, values.data()), 0);  // 68 bytes: header, then elements
        const double d = 2.25;
        ASSERT_EQ(rcfLrecWrite(f, RCF_DOUBLE, 1, &d), 0);
    }
    const std::vector<uint8_t> bytes = testutil::readBytes(path);
    ASSERT_EQ(bytes.size(), appBase + (5 + 64) + (5 + 68) + (5 + 8));
    size_t at = appBase;
    for (uint32_t n : {16u, 17u}) {
        EXPECT_EQ(bytes[at], RCF_FLOAT);
        EXPECT_EQ(le32(bytes, at + 1), n);
        EXPECT_EQ(0, std::memcmp(bytes.data() + at + 5, values.data(), n * 4));
        at += 5 + n * 4;
    }
    EXPECT_EQ(bytes[at], RCF_DOUBLE);

    File f;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, nullptr), 0);
    rcfSeekAppBase(f);
    std::vector<float> got(17);
    EXPECT_EQ(rcfLrecRead(f, RCF_FLOAT, 17, got.data()), 16u);
    EXPECT_EQ(0, std::memcmp(got.data(), values.data(), 16 * 4));
    uint32_t count = 0;
    EXPECT_EQ(rcfQuery(f, &count), RCF_FLOAT);
    EXPECT_EQ(count, 17u);
    EXPECT_EQ(rcfLrecRead(f, RCF_FLOAT, 17, got.data()), 17u);
    EXPECT_EQ(got[16], 16.5f);
    double d = 0;
    EXPECT_EQ(rcfLrecRead(f, RCF_DOUBLE, 1, &d), 1u);
    EXPECT_EQ(d, 2.25);
    EXPECT_EQ(rcfQuery(f, &count), 0);  // the end
    EXPECT_EQ(rcfGetError(f), F_EOF);
}

TEST(RcfSmallRecords, HeadersAreReadRightAfterWritesAndDeferredSkips) {
    TempDir dir;
    const std::string path = dir.file("mixed.rcf");
    File f;
    ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "t", f.out(), testApp, 1), 0);
    const int32_t a[3] = {1, 2, 3};
    const int32_t b[2] = {7, 8};
    ASSERT_EQ(rcfLrecWrite(f, RCF_INT4, 3, a), 0);
    const int64_t second = rcfTell64(f);
    ASSERT_EQ(rcfLrecWrite(f, RCF_INT4, 2, b), 0);
    ASSERT_EQ(rcfLrecWrite(f, RCF_INT4, 3, a), 0);
    // Back over the last two records, straight after a write.
    rcfSeek64(f, static_cast<uint32_t>(second), 0, 0);
    int32_t got[3] = {};
    EXPECT_EQ(rcfLrecRead(f, RCF_INT4, 3, got), 2u);
    EXPECT_EQ(got[1], 8);
    // A write, then a header read with no positioning in between.
    rcfSeek64(f, static_cast<uint32_t>(second), 0, 0);
    ASSERT_EQ(rcfLrecWrite(f, RCF_INT4, 2, a), 0);
    uint32_t count = 0;
    EXPECT_EQ(rcfQuery(f, &count), RCF_INT4);
    EXPECT_EQ(count, 3u);
    // A deferred skip over that record, then the next header.
    rcfSeek64(f, static_cast<uint32_t>(second), 0, 0);
    rcfSkipDeferred(f, 5 + 2 * 4);
    EXPECT_EQ(rcfLrecRead(f, RCF_INT4, 3, got), 3u);
    EXPECT_EQ(got[2], 3);
    EXPECT_EQ(rcfGetError(f), 0);
}

TEST(RcfSmallRecords, ASmallRecordCutShortIsAReadFailure) {
    TempDir dir;
    const std::string path = dir.file("cut.rcf");
    uint32_t appBase = 0;
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "t", f.out(), testApp, 0), 0);
        appBase = rcfGetAppBase(f);
        const double d[2] = {1.0, 2.0};
        ASSERT_EQ(rcfLrecWrite(f, RCF_DOUBLE, 2, d), 0);
    }
    std::vector<uint8_t> bytes = testutil::readBytes(path);
    bytes.resize(bytes.size() - 3);
    testutil::writeBytes(path, bytes);
    File f;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, nullptr), 0);
    rcfSeekAppBase(f);
    double got[2] = {};
    EXPECT_EQ(rcfLrecRead(f, RCF_DOUBLE, 2, got), 0u);
    EXPECT_EQ(rcfGetError(f), F_ERR_READ);
    // A header cut short is the end of the file, as it always was.
    bytes.resize(appBase + 3);
    testutil::writeBytes(path, bytes);
    File g;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), g.out(), testApp, nullptr), 0);
    rcfSeekAppBase(g);
    EXPECT_EQ(rcfLrecRead(g, RCF_DOUBLE, 2, got), 0u);
    EXPECT_EQ(rcfGetError(g), F_EOF);
}

}  // namespace
