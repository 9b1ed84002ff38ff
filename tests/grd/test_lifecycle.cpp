// File lifecycle: create, read, edit, append, flush, close and delete of
// data files; bad and legacy names; encoding keys as the first static items
// of a compressed file; a close that cannot update the header; failed opens.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "test_lifecycle_support.h"

using namespace grdtest;
namespace fs = std::filesystem;

namespace {

class LifecycleTest : public FileTest {
protected:
    // Time steps and file title as another reader sees them on disk now.
    int32_t timeStepsOnDisk(const std::string& path) {
        HeaderHandle h = nullptr;
        FileHandle f = nullptr;
        EXPECT_EQ(grdFileRead(path.c_str(), &h, &f), 0);
        int32_t steps = -1;
        grdGetEqTimeAxis(h, nullptr, nullptr, nullptr, nullptr, &steps, nullptr);
        grdFileClose(h, &f);
        grdHeaderDestroy(&h);
        return steps;
    }
    std::string titleOnDisk(const std::string& path) {
        HeaderHandle h = nullptr;
        FileHandle f = nullptr;
        EXPECT_EQ(grdFileRead(path.c_str(), &h, &f), 0);
        std::string title = grdGetFileTitle(h);
        grdFileClose(h, &f);
        grdHeaderDestroy(&h);
        return title;
    }

    // The dynamic section as the time-step writer lays it out, written by
    // hand: 50000 once (when begin), then per time step an empty 50001 and
    // one float record per item.
    void writeTimeSteps(int32_t steps, bool begin) {
        if (begin) {
            ASSERT_EQ(grdCheckWriteLB(header_, kTagDynamicStart, nullptr, file_, "test", 0), 0);
            file_->ownerMark = 3;
        }
        for (int32_t t = 0; t < steps; ++t) {
            ASSERT_EQ(grdCheckWriteLB(header_, kTagTimeStep, nullptr, file_, "test", 0), 0);
            for (int32_t i = 0; i < grdGetNoOfItems(header_); ++i) {
                const float v = static_cast<float>(100 * header_->timeStepsDone + i);
                ASSERT_EQ(rcfLrecWrite(file_, RCF_FLOAT, 1, &v), 0);
            }
            ++header_->timeStepsDone;
        }
    }
};

TEST_F(LifecycleTest, CreateCloseReadEditRoundTrip) {
    makeFileHeader(3);
    ASSERT_EQ(grdSetFileTitle(header_, "round trip"), 0);
    const std::string path = dir_.file("a/b/round.grd");  // folders are made on the way
    create(path);
    EXPECT_EQ(file_->ownerMark, 1u);
    EXPECT_EQ(file_->readOnly, 0u);
    close();
    ASSERT_TRUE(fs::is_regular_file(path));

    openRead(path);
    EXPECT_STREQ(grdGetFileTitle(header_), "round trip");
    EXPECT_EQ(grdGetNoOfItems(header_), 3);
    EXPECT_EQ(file_->readOnly, 1u);
    EXPECT_EQ(file_->ownerMark, 1u);
    EXPECT_EQ(grdFileFlush(header_, file_), 2015);  // reading only
    EXPECT_EQ(takeCodes(), Codes{2015});
    close();  // a file open for reading is closed without an update

    // The header of one file can create another: its cursor starts afresh.
    header_->timeStepsDone = 4;
    header_->nextItem = 1;
    create(dir_.file("copy.grd"));
    EXPECT_EQ(header_->timeStepsDone, 0);
    EXPECT_EQ(header_->nextItem, 0);
    close();

    // Editing rewrites the header in place on close.
    if (header_ != nullptr) grdHeaderDestroy(&header_);
    ASSERT_EQ(grdFileEdit(path.c_str(), &header_, &file_), 0);
    EXPECT_EQ(file_->readOnly, 0u);
    const auto size = fs::file_size(path);
    ASSERT_EQ(grdSetFileTitle(header_, "ROUND TRIP"), 0);
    close();
    EXPECT_EQ(fs::file_size(path), size);
    EXPECT_EQ(titleOnDisk(path), "ROUND TRIP");
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(LifecycleTest, BadNamesAreRefusedWithoutReports) {
    makeFileHeader();
    FileHandle sentinel = reinterpret_cast<FileHandle>(0x1);
    FileHandle out = sentinel;
    EXPECT_EQ(grdFileCreate("", header_, &out), 2002);
    EXPECT_EQ(grdFileCreate(nullptr, header_, &out), 2002);
    EXPECT_EQ(out, sentinel);  // not touched
    // A folder as the name: refused, but the folders of the path were made first.
    const std::string folder = dir_.file("made/here/");
    EXPECT_EQ(grdFileCreateEx(folder.c_str(), header_, &out, 1), 2002);
    EXPECT_TRUE(fs::is_directory(dir_.file("made/here")));
    EXPECT_EQ(grdFileCreate(dir_.path().string().c_str(), header_, &out), 2002);
    EXPECT_EQ(out, sentinel);

    HeaderHandle h = reinterpret_cast<HeaderHandle>(0x1);
    FileHandle f = sentinel;
    EXPECT_EQ(grdFileRead("", &h, &f), 2003);
    EXPECT_EQ(grdFileRead(nullptr, &h, &f), 2003);
    EXPECT_EQ(grdFileRead(dir_.file("missing.grd").c_str(), &h, &f), 2003);
    EXPECT_EQ(grdFileRead(dir_.path().string().c_str(), &h, &f), 2003);
    EXPECT_EQ(h, nullptr);
    EXPECT_EQ(f, nullptr);

    EXPECT_EQ(grdFileDelete(""), 1000);
    EXPECT_EQ(grdFileDelete(nullptr), 1000);
    EXPECT_EQ(grdFileDelete(dir_.file("missing.grd").c_str()), 1000);
    EXPECT_EQ(grdFileDelete(dir_.path().string().c_str()), 1000);
    EXPECT_TRUE(fs::is_directory(dir_.path()));
    EXPECT_EQ(takeCodes(), Codes{});

    // Missing handles and out pointers are reported.
    EXPECT_EQ(grdFileCreate(dir_.file("x.grd").c_str(), nullptr, &out), 1000);
    EXPECT_EQ(out, nullptr);
    EXPECT_EQ(grdFileCreate(dir_.file("x.grd").c_str(), header_, nullptr), 1000);
    EXPECT_FALSE(fs::exists(dir_.file("x.grd")));
    EXPECT_EQ(grdFileClose(nullptr, &f), 1000);
    EXPECT_EQ(grdFileClose(header_, nullptr), 1000);
    EXPECT_EQ(grdFileFlush(header_, nullptr), 1000);
    EXPECT_EQ(grdFileFlushTimeStep(nullptr, nullptr), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000, 1000, 1000, 1000}));
}

TEST_F(LifecycleTest, LegacyNamesAreRefusedAndOthersAreOrdinary) {
    makeFileHeader();
    FileHandle out = nullptr;
    for (const char* name : {"old.DT2", "old.dt0", "old.Ct4", "old.dt3x"}) {
        const std::string path = dir_.file(name);
        EXPECT_EQ(grdFileCreate(path.c_str(), header_, &out), 2010) << name;
        EXPECT_EQ(out, nullptr);
        EXPECT_FALSE(fs::exists(path)) << name;
    }
    EXPECT_EQ(takeCodes(), (Codes{2010, 2010, 2010, 2010}));

    // An existing file of a legacy name is not opened.
    const std::string legacy = dir_.file("there.DT2");
    testutil::writeBytes(legacy, {1, 2, 3, 4});
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    EXPECT_EQ(grdFileRead(legacy.c_str(), &h, &f), 2010);
    EXPECT_EQ(h, nullptr);
    EXPECT_EQ(f, nullptr);
    EXPECT_EQ(takeCodes(), Codes{2010});

    // .dt5 and, outside Windows, .lnk are ordinary data files.
#ifdef _WIN32
    for (const char* name : {"new.dt5", "new.DT"}) {
#else
    for (const char* name : {"new.dt5", "new.DT", "link.lnk"}) {
#endif
        const std::string path = dir_.file(name);
        create(path);
        close();
        openRead(path);
        close();
        EXPECT_EQ(grdFileDelete(path.c_str()), 0);
        EXPECT_FALSE(fs::exists(path)) << name;
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(LifecycleTest, CompressedFileKeepsItsKeysAsFirstStaticItems) {
    makeFileHeader();
    const int32_t x[4] = {0, 1, 2, 3}, y[4] = {5, 6, 7, 8}, z[4] = {9, 9, 9, 9};
    ASSERT_EQ(grdSetEncodeKey(header_, x, y, z, 4), 0);
    const std::string path = dir_.file("keys.grd");
    create(path);
    EXPECT_EQ(file_->ownerMark, 2u);
    StaticItem user;
    describeScalar(user.get(), "user");
    const float one = 1.0f;
    ASSERT_EQ(grdStaticWrite(user.get(), file_, &one), 0);
    close();
    EXPECT_EQ(staticNames(path),
              (std::vector<std::string>{"X-Encoding Key", "Y-Encoding Key", "Z-Encoding Key", "user"}));

    // Read, edit and append all load the keys and leave the file after them.
    using Open = int32_t(TOVA_CALL*)(const char*, HeaderHandle*, FileHandle*);
    for (Open open : {Open(grdFileRead), Open(grdFileEdit), Open(grdFileAppend)}) {
        if (header_ != nullptr) grdHeaderDestroy(&header_);
        ASSERT_EQ(open(path.c_str(), &header_, &file_), 0);
        EXPECT_EQ(grdIsFileCompressed(header_), 1);
        ASSERT_EQ(grdGetEncodeKeySize(header_), 4);
        int32_t xb[4] = {}, yb[4] = {}, zb[4] = {};
        grdGetEncodeKey(header_, xb, yb, zb);
        EXPECT_EQ(std::vector<int32_t>(xb, xb + 4), std::vector<int32_t>(x, x + 4));
        EXPECT_EQ(std::vector<int32_t>(yb, yb + 4), std::vector<int32_t>(y, y + 4));
        EXPECT_EQ(std::vector<int32_t>(zb, zb + 4), std::vector<int32_t>(z, z + 4));
        if (open != Open(grdFileAppend)) {
            StaticItem next(grdStaticRead(file_, nullptr));
            ASSERT_TRUE(next);
            const char* name = nullptr;
            grdGetItemInfo_(next.get(), nullptr, &name, nullptr, nullptr);
            EXPECT_STREQ(name, "user");
        }
        close();
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(LifecycleTest, KeysAreTakenByPosition) {
    makeFileHeader();
    const int32_t x[3] = {1, 2, 3}, z[3] = {7, 8, 9};
    ASSERT_EQ(grdSetEncodeKey(header_, x, nullptr, z, 3), 0);
    const std::string path = dir_.file("xz.grd");
    create(path);
    close();
    EXPECT_EQ(staticNames(path), (std::vector<std::string>{"X-Encoding Key", "Z-Encoding Key"}));

    openRead(path);
    ASSERT_EQ(grdGetEncodeKeySize(header_), 3);
    EXPECT_NE(header_->keyY, nullptr);
    EXPECT_EQ(header_->keyZ, nullptr);
    int32_t xb[3] = {}, yb[3] = {}, zb[3] = {-1, -1, -1};
    grdGetEncodeKey(header_, xb, yb, zb);
    EXPECT_EQ(std::vector<int32_t>(xb, xb + 3), std::vector<int32_t>(x, x + 3));
    EXPECT_EQ(std::vector<int32_t>(yb, yb + 3), std::vector<int32_t>(z, z + 3));  // the second is Y
    EXPECT_EQ(zb[0], -1);
    close();
}

TEST_F(LifecycleTest, AppendStandsAtTheEndWithTheTimeStepCount) {
    makeFileHeader(2);
    const std::string path = dir_.file("append.grd");
    create(path);
    writeTimeSteps(3, true);
    close();
    const auto size = fs::file_size(path);
    EXPECT_EQ(timeStepsOnDisk(path), 3);

    if (header_ != nullptr) grdHeaderDestroy(&header_);
    ASSERT_EQ(grdFileAppend(path.c_str(), &header_, &file_), 0);
    EXPECT_EQ(header_->timeStepsDone, 3);
    EXPECT_EQ(header_->nextItem, 0);
    EXPECT_EQ(file_->ownerMark, 3u);
    EXPECT_EQ(rcfTell64(file_), static_cast<int64_t>(size));
    // Static items cannot follow dynamic data.
    StaticItem late;
    describeScalar(late.get(), "late");
    const float v = 0;
    EXPECT_EQ(grdStaticWrite(late.get(), file_, &v), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});

    writeTimeSteps(2, false);
    close();
    EXPECT_EQ(timeStepsOnDisk(path), 5);
    // Two time steps: an empty 50001 block (4 bytes) and two 1-float records (9 bytes each).
    EXPECT_EQ(fs::file_size(path), size + 2 * (4 + 2 * 9));
    EXPECT_EQ(takeCodes(), Codes{});
}

// A file without dynamic data is appended to in the section it ends in: the
// first time step written then begins the dynamic section itself. A file
// closed with nothing after its header was given an empty dynamic section.
TEST_F(LifecycleTest, AppendContinuesTheSectionTheFileEndsIn) {
    makeFileHeader();
    const std::string bare = dir_.file("bare.grd");
    create(bare);
    close();
    const std::string statics = dir_.file("statics.grd");
    create(statics);
    StaticItem first;
    describeScalar(first.get(), "first");
    const float one = 1.0f, two = 2.0f;
    ASSERT_EQ(grdStaticWrite(first.get(), file_, &one), 0);
    close();

    if (header_ != nullptr) grdHeaderDestroy(&header_);
    ASSERT_EQ(grdFileAppend(bare.c_str(), &header_, &file_), 0);
    EXPECT_EQ(file_->ownerMark, 3u);
    close();
    EXPECT_EQ(staticNames(bare), std::vector<std::string>{});

    if (header_ != nullptr) grdHeaderDestroy(&header_);
    ASSERT_EQ(grdFileAppend(statics.c_str(), &header_, &file_), 0);
    EXPECT_EQ(file_->ownerMark, 2u);
    StaticItem second;
    describeScalar(second.get(), "second");
    ASSERT_EQ(grdStaticWrite(second.get(), file_, &two), 0);
    close();
    EXPECT_EQ(staticNames(statics), (std::vector<std::string>{"first", "second"}));
    EXPECT_EQ(takeCodes(), Codes{});
}

// The header on disk is rewritten at once while fewer than two time steps
// are written and the cursor is at the first item, else at most once a second.
TEST_F(LifecycleTest, FlushThrottle) {
    makeFileHeader();
    ASSERT_EQ(grdSetFileTitle(header_, "aaaa"), 0);
    const std::string path = dir_.file("flush.grd");
    create(path);
    StaticItem item;  // a header alone cannot be read back: give it something to end at
    describeScalar(item.get(), "s");
    const float one = 1.0f;
    ASSERT_EQ(grdStaticWrite(item.get(), file_, &one), 0);
    ASSERT_EQ(std::fflush(file_->stream), 0);

    // "Just flushed" is made exact by setting the time of the last flush.
    const auto flushedNow = [&] { file_->openClock = rcfClockMs(); };
    header_->timeStepsDone = 2;  // no force, flushed just now: nothing is rewritten
    flushedNow();
    EXPECT_EQ(grdFileFlushTimeStep(header_, file_), 0);
    EXPECT_EQ(timeStepsOnDisk(path), 0);
    header_->timeStepsDone = 1;  // forced
    EXPECT_EQ(grdFileFlushTimeStep(header_, file_), 0);
    EXPECT_EQ(timeStepsOnDisk(path), 1);
    header_->timeStepsDone = 3;
    flushedNow();
    EXPECT_EQ(grdFileFlushTimeStep(header_, file_), 0);
    EXPECT_EQ(timeStepsOnDisk(path), 1);
    file_->openClock -= 2000;  // more than a second ago
    EXPECT_EQ(grdFileFlushTimeStep(header_, file_), 0);
    EXPECT_EQ(timeStepsOnDisk(path), 3);

    ASSERT_EQ(grdSetFileTitle(header_, "bbbb"), 0);
    flushedNow();
    EXPECT_EQ(grdFileFlush(header_, file_), 0);
    EXPECT_EQ(titleOnDisk(path), "aaaa");
    header_->timeStepsDone = 1;
    header_->nextItem = 1;  // inside a time step: no force either
    flushedNow();
    EXPECT_EQ(grdFileFlush(header_, file_), 0);
    EXPECT_EQ(titleOnDisk(path), "aaaa");
    header_->nextItem = 0;
    EXPECT_EQ(grdFileFlush(header_, file_), 0);
    EXPECT_EQ(titleOnDisk(path), "bbbb");
    header_->timeStepsDone = 3;
    close();
    EXPECT_EQ(timeStepsOnDisk(path), 3);
    EXPECT_EQ(takeCodes(), Codes{});
}

// When the final header update fails the file stays open with its data; the
// caller may retry.
TEST_F(LifecycleTest, CloseRefusesWhenTheUpdateFails) {
#ifdef _WIN32
    GTEST_SKIP() << "an open file cannot be renamed away on Windows";
#endif
    makeFileHeader();
    const std::string path = dir_.file("retry.grd");
    const std::string away = dir_.file("away.grd");
    create(path);
    StaticItem item;
    describe(header_, item.get(), "kept", QTY_ITEM_UNDEFINED, 0, RCF_DOUBLE,
             [](ItemHandle i) { return grdSetItemAxisEqD1(i, 0, 3, 0.0f, 1.0f); });
    const double values[3] = {1.25, 2.5, 3.75};
    ASSERT_EQ(grdStaticWrite(item.get(), file_, values), 0);
    ASSERT_EQ(grdSetFileTitle(header_, "done"), 0);

    fs::rename(path, away);  // the update cannot reopen the file by its name
    EXPECT_NE(grdFileClose(header_, &file_), 0);
    ASSERT_NE(file_, nullptr);
    EXPECT_FALSE(takeCodes().empty());
    fs::rename(away, path);
    close();

    openRead(path);
    EXPECT_STREQ(grdGetFileTitle(header_), "done");
    StaticItem back(grdStaticRead(file_, nullptr));
    ASSERT_TRUE(back);
    double got[3] = {};
    ASSERT_EQ(grdStaticGetData(back.get(), got), 0);
    EXPECT_EQ(std::vector<double>(got, got + 3), std::vector<double>(values, values + 3));
}

TEST_F(LifecycleTest, FailedOpensGiveNoHandles) {
    makeFileHeader();
    const std::string good = dir_.file("good.grd");
    create(good);
    close();
    const std::vector<uint8_t> bytes = testutil::readBytes(good);

    const std::string garbage = dir_.file("garbage.grd");
    testutil::writeBytes(garbage, std::vector<uint8_t>(200, 0x41));
    const std::string cut = dir_.file("cut.grd");
    testutil::writeBytes(cut, std::vector<uint8_t>(bytes.begin(), bytes.end() - 20));
    const std::string missing = dir_.file("missing.grd");

    using Open = int32_t(TOVA_CALL*)(const char*, HeaderHandle*, FileHandle*);
    for (Open open : {Open(grdFileRead), Open(grdFileEdit), Open(grdFileAppend)}) {
        for (const std::string& path : {garbage, cut, missing}) {
            HeaderHandle h = reinterpret_cast<HeaderHandle>(0x1);
            FileHandle f = reinterpret_cast<FileHandle>(0x1);
            EXPECT_NE(open(path.c_str(), &h, &f), 0) << path;
            EXPECT_EQ(h, nullptr);
            EXPECT_EQ(f, nullptr);
        }
        EXPECT_EQ(open(good.c_str(), nullptr, nullptr), 1000);
    }
    EXPECT_FALSE(fs::exists(missing));
    EXPECT_EQ(testutil::readBytes(cut).size(), bytes.size() - 20);
}

TEST_F(LifecycleTest, DeleteRemovesTheFile) {
    makeFileHeader();
    const std::string path = dir_.file("gone.grd");
    create(path);
    close();
    EXPECT_EQ(grdFileDelete(path.c_str()), 0);
    EXPECT_FALSE(fs::exists(path));
    EXPECT_EQ(grdFileDelete(path.c_str()), 1000);
    EXPECT_EQ(takeCodes(), Codes{});
}

}  // namespace
