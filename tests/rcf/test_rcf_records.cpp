// Logical records: simple types, record bytes, the look-ahead, skips and
// positioning, the sticky error, counts that the file cannot hold, write
// failures, the layer's own handler table and independent files on threads.
#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include <csignal>

#include "rcf_testutil.h"
#if TOVA_TEST_POSIX
#include <sys/resource.h>
#endif

// Sanitizers reserve far more address space than any limit a test can set.
#if defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define TOVA_TEST_ADDRESS_LIMIT 0
#endif
#elif defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define TOVA_TEST_ADDRESS_LIMIT 0
#endif
#ifndef TOVA_TEST_ADDRESS_LIMIT
#define TOVA_TEST_ADDRESS_LIMIT TOVA_TEST_POSIX
#endif

using namespace rcftest;
using testutil::readBytes;
using testutil::TempDir;
using testutil::writeBytes;

namespace {

// A file with: integer*2 {1, -2, 300} (11 bytes), double {0.5} (13 bytes),
// an empty block 9 (4 bytes), byte {7, 8} (7 bytes).
class Records : public testing::Test {
protected:
    void SetUp() override {
        path_ = dir_.file("r.rcf");
        ASSERT_EQ(rcfFileOpenCreate(path_.c_str(), "", f_.out(), testApp, 1), 0);
        base_ = rcfGetAppBase(f_);
        const int16_t shorts[3] = {1, -2, 300};
        const double d = 0.5;
        const uint8_t bytes[2] = {7, 8};
        ASSERT_EQ(rcfLrecWrite(f_, RCF_INT2, 3, shorts), 0);
        ASSERT_EQ(rcfLrecWrite(f_, RCF_DOUBLE, 1, &d), 0);
        ASSERT_EQ(rcfBlockWrite(9, f_, nullptr), 0);
        ASSERT_EQ(rcfLrecWrite(f_, RCF_BYTE, 2, bytes), 0);
        rcfSeekAppBase(f_);
    }

    TempDir dir_;
    std::string path_;
    File f_;
    int64_t base_ = 0;
};

}  // namespace

TEST(RcfSimpleTypes, NamesSizesAndValidity) {
    const char* names[] = {"block", "terminator", "unknown", "float", "double",
                           "byte",  "integer*4",  "unsigned*4", "integer*2", "unsigned*2"};
    const int sizes[] = {0, 0, 0, 4, 8, 1, 4, 4, 2, 2};
    for (int code = -2; code <= 7; ++code) {
        EXPECT_STREQ(rcfSimpName(code), names[code + 2]);
        EXPECT_EQ(rcfSimpSize(code), sizes[code + 2]);
        EXPECT_EQ(rcfSimpValid(code), 1) << code;
    }
    for (int code : {-3, 8, 127, -128}) {
        EXPECT_STREQ(rcfSimpName(code), "unknown");
        EXPECT_EQ(rcfSimpSize(code), 0);
        EXPECT_EQ(rcfSimpValid(code), 0);
    }
    EXPECT_EQ(rcfRecordBytes(RCF_DOUBLE, 3), 24u);
    EXPECT_EQ(rcfRecordBytes(RCF_DOUBLE, 0), 0u);
    EXPECT_EQ(rcfRecordBytes(RCF_BLOCK, 3), 0u);
    EXPECT_EQ(rcfRecordBytes(RCF_DOUBLE, 0x20000000u), 0u);  // beyond 32 bits
}

TEST_F(Records, LayoutOnDisk) {
    const auto b = readBytes(path_);
    ASSERT_EQ(b.size(), static_cast<size_t>(base_) + 11 + 13 + 4 + 7);
    const std::vector<uint8_t> shorts(b.begin() + base_, b.begin() + base_ + 11);
    EXPECT_EQ(shorts, (std::vector<uint8_t>{6, 3, 0, 0, 0, 1, 0, 0xFE, 0xFF, 0x2C, 0x01}));
    const std::vector<uint8_t> block(b.begin() + base_ + 24, b.begin() + base_ + 28);
    EXPECT_EQ(block, (std::vector<uint8_t>{0xFE, 9, 0, 0xFF}));
    // A zero-count write puts nothing on disk and is no failure.
    rcfSeek64(f_, 0, 0, 2);
    EXPECT_EQ(rcfLrecWrite(f_, RCF_FLOAT, 0, nullptr), 0);
    EXPECT_EQ(rcfTell64(f_), base_ + 35);
    // A record of more than 4 GiB does not fit the format and is refused.
    const double d = 0;
    EXPECT_EQ(rcfLrecWrite(f_, RCF_DOUBLE, 0x20000000u, &d), F_ERR_TYPE);
    EXPECT_EQ(rcfGetError(f_), F_ERR_TYPE);
    EXPECT_EQ(rcfTell64(f_), base_ + 35);
}

TEST_F(Records, SkipMovesOverOneRecordOrMark) {
    EXPECT_EQ(rcfSkip(f_), RCF_INT2);
    EXPECT_EQ(rcfTell64(f_), base_ + 11);
    EXPECT_EQ(rcfSkip(f_), RCF_DOUBLE);
    EXPECT_EQ(rcfTell64(f_), base_ + 24);
    EXPECT_EQ(rcfSkip(f_), RCF_BLOCK);  // the mark alone
    EXPECT_EQ(rcfTell64(f_), base_ + 27);
    EXPECT_EQ(rcfSkip(f_), RCF_TERMINATOR);
    EXPECT_EQ(rcfTell64(f_), base_ + 28);
    uint8_t bytes[2] = {};
    EXPECT_EQ(rcfLrecRead(f_, RCF_BYTE, 2, bytes), 2u);
    EXPECT_EQ(bytes[1], 8);
    EXPECT_EQ(rcfSkip(f_), 0);
    EXPECT_EQ(rcfGetError(f_), F_EOF);
}

TEST_F(Records, QueryPeeksAndTellDiffersFromTell64) {
    uint32_t count = 0;
    EXPECT_EQ(rcfQuery(f_, &count), RCF_INT2);
    EXPECT_EQ(count, 3u);
    // The header is cached: the stream is ahead of the logical position.
    EXPECT_EQ(rcfTell(f_), base_ + 5);
    EXPECT_EQ(rcfQuery(f_, &count), RCF_INT2);
    EXPECT_EQ(rcfTell(f_), base_ + 5);  // handed out again, not read again
    int16_t shorts[3] = {};
    EXPECT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 3u);
    EXPECT_EQ(shorts[2], 300);

    EXPECT_EQ(rcfQuery(f_, &count), RCF_DOUBLE);
    EXPECT_EQ(rcfTell64(f_), base_ + 11);  // moves the stream back to the record
    EXPECT_EQ(rcfTell(f_), base_ + 11);
    rcfSkip(f_);
    EXPECT_EQ(rcfQuery(f_, &count), RCF_BLOCK);
    EXPECT_EQ(count, 9u);
    EXPECT_EQ(rcfTell(f_) - rcfTell64(f_), 3);
    rcfSkip(f_);
    count = 77;
    EXPECT_EQ(rcfQuery(f_, &count), RCF_TERMINATOR);
    EXPECT_EQ(count, 77u);  // a terminator has no count
    EXPECT_EQ(rcfTell(f_) - rcfTell64(f_), 1);
}

TEST_F(Records, DeferredAndShortSkips) {
    rcfSkipDeferred(f_, 11);
    EXPECT_EQ(rcfTell(f_), base_);  // nothing moved yet
    double d = 0;
    EXPECT_EQ(rcfLrecRead(f_, RCF_DOUBLE, 1, &d), 1u);
    EXPECT_EQ(d, 0.5);

    rcfSeekAppBase(f_);
    rcfSkipDeferred(f_, 11);
    rcfSkipDeferred(f_, 13);
    EXPECT_EQ(rcfTell64(f_), base_ + 24);
    EXPECT_EQ(rcfSkip(f_), RCF_BLOCK);

    // Short forward skips after a read keep reading; long ones seek.
    rcfSeekAppBase(f_);
    int16_t shorts[3];
    ASSERT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 3u);
    rcfSkipBytes(f_, 13);
    EXPECT_EQ(f_.get()->lastOp, 1);
    EXPECT_EQ(rcfQuery(f_, nullptr), RCF_BLOCK);
    rcfSeekAppBase(f_);
    rcfSkipBytes(f_, 28);
    EXPECT_EQ(f_.get()->lastOp, 1);
    uint8_t bytes[2];
    EXPECT_EQ(rcfLrecRead(f_, RCF_BYTE, 2, bytes), 2u);
    rcfSkipBytes(f_, 5000);
    EXPECT_EQ(f_.get()->lastOp, 0);  // positioned, not read
    EXPECT_EQ(rcfTell64(f_), base_ + 35 + 5000);

    // A pending skip larger than the pending counter holds is applied at once.
    rcfSeekAppBase(f_);
    rcfSkipDeferred64(f_, 0x100000000ull);
    EXPECT_EQ(rcfTell64(f_), base_ + 0x100000000ll);
}

TEST_F(Records, WrongTypeLeavesAStickyError) {
    double d = 0;
    EXPECT_EQ(rcfLrecRead(f_, RCF_DOUBLE, 1, &d), 0u);
    EXPECT_EQ(rcfPeekError(f_), F_ERR_TYPE);
    int16_t shorts[3];
    EXPECT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 0u);  // every transfer is now a no-op
    EXPECT_EQ(rcfQuery(f_, nullptr), 0);
    EXPECT_EQ(rcfSkip(f_), 0);
    rcfSeekAppBase(f_);  // positioning clears only end of file
    EXPECT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 0u);
    EXPECT_EQ(rcfGetError(f_), F_ERR_TYPE);
    EXPECT_EQ(rcfGetError(f_), 0);
    rcfSeekAppBase(f_);
    EXPECT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 3u);

    // A record longer than the caller's maximum.
    EXPECT_EQ(rcfLrecRead(f_, RCF_DOUBLE, 0, &d), 0u);
    EXPECT_EQ(rcfGetError(f_), F_ERR_SIZE);
}

TEST_F(Records, EndOfFileIsClearedByPositioning) {
    rcfSeek64(f_, 0, 0, 2);
    int16_t shorts[3];
    EXPECT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 0u);
    EXPECT_EQ(rcfPeekError(f_), F_EOF);
    rcfSeek64(f_, static_cast<uint32_t>(base_), 0, 0);
    EXPECT_EQ(rcfPeekError(f_), 0);
    EXPECT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 3u);
    rcfSeek64(f_, 0, 0, 2);
    EXPECT_EQ(rcfQuery(f_, nullptr), 0);
    EXPECT_EQ(rcfPeekError(f_), F_EOF);
    rcfSkipDeferred(f_, 0);
    EXPECT_EQ(rcfPeekError(f_), 0);
    // A failed positioning is an error of its own.
    rcfSeek64(f_, 0, 0, 7);
    EXPECT_EQ(rcfGetError(f_), F_ERR_SEEK);
}

TEST_F(Records, BlockMarksAreNotDataRecords) {
    rcfSeek64(f_, static_cast<uint32_t>(base_ + 24), 0, 0);
    uint8_t bytes[2];
    EXPECT_EQ(rcfLrecRead(f_, RCF_BYTE, 2, bytes), 0u);
    EXPECT_EQ(rcfGetError(f_), F_ERR_SKIP);
    uint32_t id = 0;
    EXPECT_EQ(rcfQuery(f_, &id), RCF_BLOCK);  // the mark was left in place
    EXPECT_EQ(id, 9u);

    // Outside a block, rcfLrecReadAlloc leaves a mark for the next caller.
    int32_t type = 0;
    uint32_t count = 0;
    EXPECT_EQ(rcfLrecReadAlloc(f_, &type, &count), nullptr);
    EXPECT_EQ(type, RCF_BLOCK);
    EXPECT_EQ(rcfPeekError(f_), 0);
    EXPECT_EQ(rcfQuery(f_, nullptr), RCF_BLOCK);
}

TEST(RcfNullHandle, EveryOperationHasAFallback) {
    EXPECT_EQ(rcfGetError(nullptr), F_ERR_ARGUMENT);
    EXPECT_EQ(rcfPeekError(nullptr), F_ERR_ARGUMENT);
    EXPECT_EQ(rcfLrecWrite(nullptr, RCF_INT4, 1, nullptr), F_ERR_ARGUMENT);
    EXPECT_EQ(rcfLrecRead(nullptr, RCF_INT4, 1, nullptr), 0u);
    EXPECT_EQ(rcfLrecReadAlloc(nullptr, nullptr, nullptr), nullptr);
    EXPECT_EQ(rcfQuery(nullptr, nullptr), 0);
    EXPECT_EQ(rcfSkip(nullptr), 0);
    EXPECT_EQ(rcfTell64(nullptr), -1);
    EXPECT_EQ(rcfTell(nullptr), -1);
    rcfSeek64(nullptr, 0, 0, 0);
    EXPECT_EQ(rcfGetRCFbase(nullptr), 0u);
    EXPECT_EQ(rcfGetVersionEditApp(nullptr), 0u);
    EXPECT_EQ(rcfBlockSkip(nullptr), F_ERR_ARGUMENT);
    EXPECT_EQ(rcfBlockRead(nullptr, nullptr, nullptr), 0);
}

TEST_F(Records, ReadAllocHandsOutBuffersToFree) {
    int32_t type = 0;
    uint32_t count = 0;
    void* data = rcfLrecReadAlloc(f_, &type, &count);
    ASSERT_NE(data, nullptr);
    EXPECT_EQ(type, RCF_INT2);
    EXPECT_EQ(count, 3u);
    EXPECT_EQ(static_cast<int16_t*>(data)[1], -2);
    rcfLrecFree(&data);
    EXPECT_EQ(data, nullptr);
    rcfLrecFree(&data);
    rcfLrecFree(nullptr);
}

TEST_F(Records, ReadsAndWritesInterleave) {
    // After a read a write continues at the logical position, and a read
    // after a write sees what was written.
    int16_t shorts[3];
    ASSERT_EQ(rcfLrecRead(f_, RCF_INT2, 3, shorts), 3u);
    EXPECT_EQ(rcfQuery(f_, nullptr), RCF_DOUBLE);  // a cached header is given up by the write
    const double replaced = 4.0;
    ASSERT_EQ(rcfLrecWrite(f_, RCF_DOUBLE, 1, &replaced), 0);
    EXPECT_EQ(rcfSkip(f_), RCF_BLOCK);
    rcfSeekAppBase(f_);
    rcfSkip(f_);
    double d = 0;
    ASSERT_EQ(rcfLrecRead(f_, RCF_DOUBLE, 1, &d), 1u);
    EXPECT_EQ(d, 4.0);
    EXPECT_EQ(rcfTell64(f_), base_ + 24);
}

TEST(RcfLimits, CountsBeyondTheFileAreRefusedBeforeAllocating) {
    TempDir dir;
    const std::string path = dir.file("huge.rcf");
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "", f.out(), testApp, 1), 0);
    }
    const auto header = readBytes(path);
    std::string b(header.begin(), header.end());
    // A byte record claiming 2^31 elements, a double record whose size
    // passes 32 bits, and a block holding the first; 100 bytes follow.
    const size_t first = b.size();
    b += '\x03';
    putBE(b, 0x00000080u, 4);  // little-endian 0x80000000
    b.append(100, '\x55');
    const size_t second = b.size();
    b += '\x02';
    putBE(b, 0x00000040u, 4);
    const size_t third = b.size();
    b += std::string("\xFE\x01\x00", 3);
    b += '\x03';
    putBE(b, 0x00000080u, 4);
    b.append(100, '\x55');
    writeBytes(path, toBytes(b));

    auto readAllocStatus = [&](size_t at) {
        File f;
        EXPECT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, nullptr), 0);
        rcfSeek64(f, static_cast<uint32_t>(at), 0, 0);
        int32_t type = 0;
        uint32_t count = 0;
        void* data = rcfLrecReadAlloc(f, &type, &count);
        EXPECT_EQ(data, nullptr);
        rcfLrecFree(&data);
        return rcfGetError(f);
    };
    EXPECT_EQ(readAllocStatus(first), F_ERR_READ);
    EXPECT_EQ(readAllocStatus(second), F_ERR_READ);

    File f;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, nullptr), 0);
    // A caller's buffer is never filled past what the record can really hold.
    uint8_t small[16];
    rcfSeek64(f, static_cast<uint32_t>(first), 0, 0);
    EXPECT_EQ(rcfLrecRead(f, RCF_BYTE, 0xFFFFFFFFu, small), 0u);
    EXPECT_EQ(rcfGetError(f), F_ERR_READ);
    rcfSeek64(f, static_cast<uint32_t>(third), 0, 0);
    uint32_t nodes = 7;
    LrecNode* list = nullptr;
    EXPECT_EQ(rcfBlockRead(f, &nodes, &list), 1);
    EXPECT_EQ(nodes, 0u);
    EXPECT_EQ(list, nullptr);
    EXPECT_EQ(rcfGetError(f), F_ERR_SKIP);

#if TOVA_TEST_ADDRESS_LIMIT
    // Under an address-space limit far below 2 GiB the refusal is the same
    // (an attempted allocation would give 2000 instead).
    const int status = runInChild([&] {
        struct rlimit limit {};
        getrlimit(RLIMIT_AS, &limit);
        long pages = 0;
        if (FILE* statm = std::fopen("/proc/self/statm", "r")) {
            if (std::fscanf(statm, "%ld", &pages) != 1) pages = 0;
            std::fclose(statm);
        }
        limit.rlim_cur = static_cast<rlim_t>(pages) * static_cast<rlim_t>(sysconf(_SC_PAGESIZE)) + (64u << 20);
        if (setrlimit(RLIMIT_AS, &limit) != 0) return -2;
        return readAllocStatus(first);
    });
    EXPECT_EQ(status, F_ERR_READ);
#endif
}

// Found by fuzz_rcf (fuzz/regressions/fuzz_rcf/skip-past-end-then-write): a
// skip over a record whose count claims more than the file holds sought far
// beyond the end, and the next write in an edited file made it gigabytes long.
TEST(RcfLimits, ASkipStopsAtTheEndOfTheFile) {
    TempDir dir;
    const std::string path = dir.file("skip.rcf");
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "", f.out(), testApp, 1), 0);
    }
    std::string b;
    {
        const auto header = readBytes(path);
        b.assign(header.begin(), header.end());
    }
    const size_t appBase = b.size();
    // A double record claiming 2^28 elements (2 GiB), 16 bytes present; then
    // the same record inside a block.
    b += '\x02';
    putBE(b, 0x00000010u, 4);  // little-endian 0x10000000
    b.append(16, '\x11');
    const size_t block = b.size();
    b += std::string("\xFE\x05\x00\x02", 4);
    putBE(b, 0x00000010u, 4);
    b.append(16, '\x22');
    writeBytes(path, toBytes(b));
    const int64_t length = static_cast<int64_t>(b.size());

    {
        File f;
        ASSERT_EQ(rcfFileOpenEdit(path.c_str(), f.out(), testApp, nullptr), 0);
        EXPECT_EQ(rcfSkip(f), RCF_DOUBLE);
        EXPECT_EQ(rcfGetError(f), F_ERR_SEEK);
        EXPECT_EQ(rcfTell64(f), length);
        const int32_t v = 5;
        EXPECT_EQ(rcfLrecWrite(f, RCF_INT4, 1, &v), 0);  // lands at the end
        rcfSeek64(f, static_cast<uint32_t>(block), 0, 0);
        EXPECT_EQ(rcfBlockSkip(f), F_ERR_SEEK);
    }
    EXPECT_EQ(readBytes(path).size(), b.size() + 9);

    File f;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, nullptr), 0);
    rcfSeek64(f, static_cast<uint32_t>(appBase), 0, 0);
    EXPECT_EQ(rcfSkip(f), RCF_DOUBLE);
    EXPECT_EQ(rcfGetError(f), F_ERR_SEEK);
    EXPECT_EQ(rcfQuery(f, nullptr), 0);  // at the end: nothing more
    EXPECT_EQ(rcfGetError(f), F_EOF);
}

TEST(RcfLimits, AFailedWriteIsReportedAs2002) {
    TempDir dir;
    const std::string path = dir.file("w.rcf");
#if !TOVA_TEST_POSIX
    TOVA_TEST_SKIP_WITHOUT_POSIX();
#else
    const int status = runInChild([&] {
        std::signal(SIGXFSZ, SIG_IGN);
        struct rlimit limit {};
        getrlimit(RLIMIT_FSIZE, &limit);
        limit.rlim_cur = 64 * 1024;
        if (setrlimit(RLIMIT_FSIZE, &limit) != 0) return -2;
        FileHandle h = nullptr;
        if (rcfFileOpenCreate(path.c_str(), "", &h, testApp, 1) != 0) return -3;
        const std::vector<uint8_t> data(1 << 20, 1);
        const int32_t first = rcfLrecWrite(h, RCF_BYTE, static_cast<uint32_t>(data.size()), data.data());
        const int32_t again = rcfLrecWrite(h, RCF_BYTE, 1, data.data());  // sticky
        rcfFileClose(&h);
        return first == again ? first : -4;
    });
    EXPECT_EQ(status, F_ERR_WRITE);
#endif
}

namespace {
std::vector<std::pair<int32_t, std::string>> g_reports;
int32_t recordReport(int32_t code, const char* module, int32_t /*line*/) {
    g_reports.emplace_back(code, module);
    return 0;
}
}  // namespace

TEST(RcfReporter, UsesItsOwnTable) {
    g_reports.clear();
    EXPECT_EQ(rcfSetErrorHandler(2015, recordReport), nullptr);
    EXPECT_EQ(rcfSetErrorHandler(2020, recordReport), nullptr);  // no slot: nothing stored
    EXPECT_EQ(rcfReportError(2021, "m", 1), 2021);
    EXPECT_EQ(rcfReportError(2020, "m", 1), 2020);
    EXPECT_TRUE(g_reports.empty());

    TempDir dir;
    const std::string path = dir.file("a.rcf");
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "", f.out(), testApp, 1), 0);
    }
    File f;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, nullptr), 0);
    const int16_t v = 1;
    EXPECT_EQ(rcfLrecWrite(f, RCF_INT2, 1, &v), F_ERR_READONLY);
    int16_t r = 0;
    rcfGetError(f);
    EXPECT_EQ(rcfLrecRead(f, RCF_INT2, 1, &r), 0u);  // end of file: never reported
    EXPECT_EQ(rcfGetError(f), F_EOF);
    ASSERT_EQ(g_reports.size(), 1u);
    EXPECT_EQ(g_reports[0].first, F_ERR_READONLY);
    EXPECT_EQ(g_reports[0].second, "..\\rcf\\rcf");
    EXPECT_EQ(rcfSetErrorHandler(2015, nullptr), &recordReport);
}

TEST(RcfThreads, DistinctFilesAreIndependent) {
    TempDir dir;
    std::vector<std::thread> threads;
    std::vector<int> failures(4, 0);
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&, t] {
            const std::string path = dir.file("t" + std::to_string(t) + ".rcf");
            FileHandle h = nullptr;
            if (rcfFileOpenCreate(path.c_str(), "", &h, testApp, 1) != 0) {
                ++failures[t];
                return;
            }
            for (int32_t i = 0; i < 500; ++i) failures[t] += rcfLrecWrite(h, RCF_INT4, 1, &i) != 0;
            rcfSeekAppBase(h);
            for (int32_t i = 0; i < 500; ++i) {
                int32_t v = -1;
                failures[t] += rcfLrecRead(h, RCF_INT4, 1, &v) != 1 || v != i;
            }
            failures[t] += rcfFileClose(&h);
        });
    }
    for (auto& thread : threads) thread.join();
    EXPECT_EQ(failures, std::vector<int>(4, 0));
}
