// Record-file container: the bytes of a created header, which files an open
// accepts, foreign byte order, the edit-stamp rewrite, stamps, versions and
// the close.
#include <gtest/gtest.h>

#include <cstdio>
#include <string>

#include "rcf_testutil.h"

using namespace rcftest;
using testutil::readBytes;
using testutil::TempDir;
using testutil::writeBytes;

namespace {

std::string stampDate(const std::vector<uint8_t>& b, size_t at) {
    char text[32];
    std::snprintf(text, sizeof(text), "%.4d-%.2d-%.2d", static_cast<int16_t>(le16(b, at)),
                  static_cast<int16_t>(le16(b, at + 2)), static_cast<int16_t>(le16(b, at + 4)));
    return text;
}

std::string stampTime(const std::vector<uint8_t>& b, size_t at) {
    char text[32];
    std::snprintf(text, sizeof(text), "%.2d:%.2d:%.2d", static_cast<int16_t>(le16(b, at + 6)),
                  static_cast<int16_t>(le16(b, at + 8)), static_cast<int16_t>(le16(b, at + 10)));
    return text;
}

std::string textAt(const std::vector<uint8_t>& b, size_t at, size_t n) {
    return std::string(reinterpret_cast<const char*>(b.data()) + at, n);
}

void createEmpty(const std::string& path, const char* appText, rcfAppIdent ident) {
    File f;
    ASSERT_EQ(rcfFileOpenCreate(path.c_str(), appText, f.out(), ident, 1), 0);
}

}  // namespace

TEST(RcfCreate, WritesTheHeaderWithTheApplicationText) {
    TempDir dir;
    const std::string path = dir.file("a.rcf");
    std::string date, time;
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "FOpenFileCreate", f.out(), testApp, 1), 0);
        EXPECT_EQ(rcfGetRCFbase(f), 82u);
        EXPECT_EQ(rcfGetAppBase(f), 130u);
        EXPECT_EQ(rcfGetVersionCreate(f), 104u);
        EXPECT_EQ(rcfGetVersionEdit(f), 104u);
        EXPECT_EQ(rcfGetVersionCreateApp(f), 7u);
        EXPECT_EQ(rcfGetVersionEditApp(f), 7u);
        EXPECT_EQ(rcfTell64(f), 130);
        date = rcfGetFileCreationDate(f);
        time = rcfGetFileCreationTime(f);
        EXPECT_EQ(std::string(rcfGetFileEditDate(f)), date);
    }
    const auto b = readBytes(path);
    ASSERT_EQ(b.size(), 130u);
    EXPECT_EQ(textAt(b, 0, 4), "QTA_");
    EXPECT_EQ(textAt(b, 4, 4), "TST_");
    EXPECT_EQ(textAt(b, 8, 56), kBanner);
    EXPECT_EQ(textAt(b, 64, 17), "  FOpenFileCreate");
    EXPECT_EQ(b[81], 0x1A);
    EXPECT_EQ(stampDate(b, 82), date);
    EXPECT_EQ(stampTime(b, 82), time);
    EXPECT_EQ(le32(b, 94), 104u);
    EXPECT_EQ(le32(b, 98), 7u);
    EXPECT_EQ(textAt(b, 102, 12), textAt(b, 82, 12));  // edit stamp = creation stamp
    EXPECT_EQ(le32(b, 114), 104u);
    EXPECT_EQ(le32(b, 118), 7u);
    EXPECT_EQ(le32(b, 122), 0u);
    EXPECT_EQ(le32(b, 126), 0u);
}

TEST(RcfCreate, EmptyTextAndMissingCallback) {
    TempDir dir;
    const std::string withoutText = dir.file("x.rcf");
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(withoutText.c_str(), "", f.out(), testApp, 0), 0);
        EXPECT_EQ(rcfGetRCFbase(f), 65u);
        EXPECT_EQ(rcfGetAppBase(f), 113u);
    }
    auto b = readBytes(withoutText);
    ASSERT_EQ(b.size(), 113u);
    EXPECT_EQ(b[64], 0x1A);

    const std::string anonymous = dir.file("n.rcf");
    createEmpty(anonymous, nullptr, nullptr);
    b = readBytes(anonymous);
    ASSERT_EQ(b.size(), 113u);
    EXPECT_EQ(le32(b, 4), 0x03030303u);
    EXPECT_EQ(le32(b, 65 + 16), 0u);
    EXPECT_EQ(le32(b, 65 + 36), 0u);
    File f;
    EXPECT_EQ(rcfFileOpenCreate(dir.file("missing/dir/a.rcf").c_str(), "", f.out(), nullptr, 1), F_ERR_OPEN);
    EXPECT_EQ(f.get(), nullptr);
}

TEST(RcfCreate, KeepsTheFullNormalisedPath) {
    TempDir dir;
    std::filesystem::create_directories(dir.path() / "sub");
    const std::string roundabout = (dir.path() / "sub" / ".." / "." / "a.rcf").string();
    File f;
    ASSERT_EQ(rcfFileOpenCreate(roundabout.c_str(), "", f.out(), testApp, 1), 0);
    EXPECT_EQ(std::string(rcfGetFilename(f)), (dir.path() / "a.rcf").string());
}

TEST(RcfOpen, AcceptsItsOwnFilesAndReadsTheHeader) {
    TempDir dir;
    const std::string path = dir.file("a.rcf");
    createEmpty(path, "FOpenFileCreate", testApp);
    File f;
    uint32_t appTag = 0;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, &appTag), 0);
    EXPECT_EQ(appTag, tagOf("TST_"));
    EXPECT_EQ(f.get()->swapBytes, 0u);
    EXPECT_EQ(f.get()->readOnly, 1u);
    EXPECT_EQ(rcfGetRCFbase(f), 82u);
    EXPECT_EQ(rcfGetAppBase(f), 130u);
    EXPECT_EQ(rcfGetVersionCreateApp(f), 7u);
    EXPECT_EQ(rcfTell64(f), 130);
    EXPECT_EQ(rcfPeekError(f), 0);
    // A file opened for reading is never written.
    const int16_t v = 1;
    EXPECT_EQ(rcfLrecWrite(f, RCF_INT2, 1, &v), F_ERR_READONLY);
    EXPECT_EQ(rcfGetError(f), F_ERR_READONLY);
    EXPECT_EQ(readBytes(path).size(), 130u);
}

TEST(RcfOpen, RefusesWhatIsNotARecordFileOfItsApplication) {
    TempDir dir;
    const int descriptors = openDescriptors();
    auto openStatus = [&](const std::string& path, rcfAppIdent ident, uint32_t* appTag = nullptr) {
        File f;
        const int32_t code = rcfFileOpenRead(path.c_str(), f.out(), ident, appTag);
        EXPECT_EQ(f.get() == nullptr, code != 0) << path;
        return code;
    };
    const std::string file = dir.file("f");
    writeBytes(file, {});
    EXPECT_EQ(openStatus(file, testApp), F_ERR_READ);
    writeBytes(file, {'Q', 'T', 'A'});
    EXPECT_EQ(openStatus(file, testApp), F_ERR_READ);
    writeBytes(file, {'Q', 'T', 'A', 'X', 0, 0, 0, 0});
    EXPECT_EQ(openStatus(file, testApp), F_ERR_NOT_RCF);
    EXPECT_EQ(openStatus(dir.file("none"), testApp), F_ERR_OPEN);

    // The right tag but no end-of-text byte: end of file, never a handle.
    std::string bytes = std::string("QTA_TST_") + kBanner;
    writeBytes(file, toBytes(bytes));
    EXPECT_EQ(openStatus(file, testApp), F_EOF);
    bytes += '\x1A';
    bytes.resize(bytes.size() + 20);  // stamps cut short
    writeBytes(file, toBytes(bytes));
    EXPECT_EQ(openStatus(file, testApp), F_EOF);

    // Another application's file.
    createEmpty(file, "", otherApp);
    uint32_t appTag = 0;
    EXPECT_EQ(openStatus(file, testApp, &appTag), F_ERR_APP_TAG);
    EXPECT_EQ(appTag, tagOf("OTH_"));
    EXPECT_EQ(openStatus(file, anyApp), 0);
    File f;
    EXPECT_EQ(rcfFileOpenRead(file.c_str(), f.out(), nullptr, nullptr), F_ERR_ARGUMENT);

    // Nothing stays open after the refusals.
    EXPECT_EQ(openDescriptors(), descriptors);
}

TEST(RcfOpen, ReadsAFileOfTheOppositeByteOrder) {
    TempDir dir;
    const std::string path = dir.file("be.rcf");
    writeBytes(path, swappedFile());
    File f;
    uint32_t appTag = 0;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, &appTag), 0);
    EXPECT_EQ(f.get()->swapBytes, 1u);
    EXPECT_EQ(appTag, tagOf("TST_"));
    EXPECT_EQ(rcfGetRCFbase(f), 65u);
    EXPECT_EQ(rcfGetAppBase(f), 113u);
    EXPECT_STREQ(rcfGetFileCreationDate(f), "2001-02-03");
    EXPECT_STREQ(rcfGetFileCreationTime(f), "04:05:06");
    EXPECT_STREQ(rcfGetFileEditDate(f), "2002-12-31");
    EXPECT_STREQ(rcfGetFileEditTime(f), "23:59:58");
    EXPECT_EQ(rcfGetVersionCreate(f), 104u);
    EXPECT_EQ(rcfGetVersionCreateApp(f), 7u);
    EXPECT_EQ(rcfGetVersionEdit(f), 103u);
    EXPECT_EQ(rcfGetVersionEditApp(f), 6u);
    int16_t values[3] = {};
    ASSERT_EQ(rcfLrecRead(f, RCF_INT2, 3, values), 3u);
    EXPECT_EQ(values[0], 1);
    EXPECT_EQ(values[1], -2);
    EXPECT_EQ(values[2], 300);
    uint32_t id = 0;
    EXPECT_EQ(rcfQuery(f, &id), RCF_BLOCK);
    EXPECT_EQ(id, 0x1234u);
}

TEST(RcfEdit, RewritesExactlyTheEditStampGroup) {
    TempDir dir;
    const std::string path = dir.file("a.rcf");
    {
        File f;
        ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "FOpenFileCreate", f.out(), testApp, 1), 0);
        const double v = 2.5;
        ASSERT_EQ(rcfLrecWrite(f, RCF_DOUBLE, 1, &v), 0);
    }
    const auto before = readBytes(path);
    std::string editDate, editTime;
    {
        File f;
        ASSERT_EQ(rcfFileOpenEdit(path.c_str(), f.out(), testAppV9, nullptr), 0);
        // The object keeps the versions that the file held.
        EXPECT_EQ(rcfGetVersionEditApp(f), 7u);
        EXPECT_EQ(f.get()->readOnly, 0u);
        EXPECT_EQ(rcfTell64(f), 130);
        editDate = rcfGetFileEditDate(f);
        editTime = rcfGetFileEditTime(f);
        double v = 0;
        EXPECT_EQ(rcfLrecRead(f, RCF_DOUBLE, 1, &v), 1u);
        EXPECT_EQ(v, 2.5);
    }
    const auto after = readBytes(path);
    ASSERT_EQ(after.size(), before.size());
    const size_t from = 82 + 20, to = 82 + 40;
    for (size_t i = 0; i < after.size(); ++i) {
        if (i < from || i >= to) {
            EXPECT_EQ(after[i], before[i]) << "byte " << i;
        }
    }
    EXPECT_EQ(stampDate(after, from), editDate);
    EXPECT_EQ(stampTime(after, from), editTime);
    EXPECT_EQ(le32(after, from + 12), 104u);
    EXPECT_EQ(le32(after, from + 16), 9u);

    File again;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), again.out(), testApp, nullptr), 0);
    EXPECT_EQ(rcfGetVersionEditApp(again), 9u);
    EXPECT_EQ(rcfGetVersionCreateApp(again), 7u);
}

TEST(RcfEdit, WritesIntoAFileOfTheOppositeByteOrder) {
    TempDir dir;
    const std::string path = dir.file("be.rcf");
    const auto original = swappedFile();
    writeBytes(path, original);
    {
        File f;
        ASSERT_EQ(rcfFileOpenEdit(path.c_str(), f.out(), testAppV9, nullptr), 0);
        rcfSeek64(f, 0, 0, 2);
        const uint32_t values[2] = {0x01020304u, 0xA0B0C0D0u};
        ASSERT_EQ(rcfLrecWrite(f, RCF_UINT4, 2, values), 0);
        const double d = -0.25;
        ASSERT_EQ(rcfLrecWrite(f, RCF_DOUBLE, 1, &d), 0);
    }
    const auto b = readBytes(path);
    ASSERT_EQ(b.size(), original.size() + 13 + 13);
    // The stamp group is rewritten in the file's own order.
    EXPECT_EQ(be32(b, 65 + 32), 104u);
    EXPECT_EQ(be32(b, 65 + 36), 9u);
    const size_t at = original.size();
    EXPECT_EQ(b[at], RCF_UINT4);
    EXPECT_EQ(be32(b, at + 1), 2u);
    EXPECT_EQ(be32(b, at + 5), 0x01020304u);
    EXPECT_EQ(be32(b, at + 9), 0xA0B0C0D0u);

    File f;
    ASSERT_EQ(rcfFileOpenRead(path.c_str(), f.out(), testApp, nullptr), 0);
    EXPECT_EQ(rcfGetVersionEditApp(f), 9u);
    rcfSeek64(f, static_cast<uint32_t>(at), 0, 0);
    uint32_t values[2] = {};
    ASSERT_EQ(rcfLrecRead(f, RCF_UINT4, 2, values), 2u);
    EXPECT_EQ(values[1], 0xA0B0C0D0u);
    double d = 0;
    ASSERT_EQ(rcfLrecRead(f, RCF_DOUBLE, 1, &d), 1u);
    EXPECT_EQ(d, -0.25);
}

TEST(RcfFile, TextsAreCachedAndCloseIsSafe) {
    TempDir dir;
    const std::string path = dir.file("a.rcf");
    File f;
    ASSERT_EQ(rcfFileOpenCreate(path.c_str(), "", f.out(), testApp, 1), 0);
    const char* date = rcfGetFileEditDate(f);
    EXPECT_EQ(rcfGetFileEditDate(f), date);
    EXPECT_EQ(std::string(date).size(), 10u);
    EXPECT_EQ(std::string(rcfGetFileEditTime(f)).size(), 8u);
    // A later stamp does not renew a text already made.
    f.get()->editStamp[0] = 1999;
    EXPECT_EQ(rcfGetFileEditDate(f), date);

    EXPECT_STREQ(rcfGetFileCreationDate(nullptr), "");
    EXPECT_STREQ(rcfGetFilename(nullptr), "");
    EXPECT_EQ(rcfGetVersionCurrent(), 104u);
    FileHandle none = nullptr;
    EXPECT_EQ(rcfFileClose(&none), 0);
    EXPECT_EQ(rcfFileClose(nullptr), 0);
    FileHandle h = f.get();
    *f.out() = nullptr;
    EXPECT_EQ(rcfFileClose(&h), 0);
    EXPECT_EQ(h, nullptr);
}
