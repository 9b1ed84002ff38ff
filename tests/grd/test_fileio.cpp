// File-open and logical-block layer and the checked transfers: the gridded
// application tag, re-reporting to user handlers, traces under the two
// flags, and what each checked transfer accepts and refuses.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <sstream>
#include <string>
#include <vector>

#include "common/testutil.h"
#include "grd/fileio.h"
#include "grd/grdio.h"
#include "tova/trace.h"

using testutil::readBytes;
using testutil::TempDir;

namespace {

struct Report {
    HeaderHandle header;
    FileHandle file;
    int32_t code;
    std::string module;
    int32_t line;
};
std::vector<Report> g_reports;

int32_t TOVA_CALL recordReport(HeaderHandle header, FileHandle file, int32_t, int32_t code, const char* module,
                               int32_t line) {
    g_reports.push_back({header, file, code, module, line});
    return 0;
}

uint32_t crossSectionApp(uint32_t* version) {
    *version = 106;
    uint32_t tag = 0;
    std::memcpy(&tag, "XFS_", 4);
    return tag;
}

// Trace lines without their indentation, and the indentation of each.
struct TraceLines {
    std::vector<std::string> text;
    std::vector<size_t> indent;
};

TraceLines splitTrace(const std::string& out) {
    TraceLines lines;
    std::istringstream in(out);
    for (std::string line; std::getline(in, line);) {
        const size_t first = line.find_first_not_of(' ');
        lines.indent.push_back(first == std::string::npos ? line.size() : first);
        lines.text.push_back(first == std::string::npos ? "" : line.substr(first));
    }
    return lines;
}

std::string pointerText(const void* p) {
    char text[32];
    std::snprintf(text, sizeof(text), "%p", p);
    return text;
}

class FileIo : public testing::Test {
protected:
    void SetUp() override {
        grdInitSystem();
        for (int32_t code : {1000, 2001, 2003, 2009, 2013, 2014, 2015, 2016, 2017, 2019}) {
            grdAddErrorHandler(code, recordReport);
        }
        g_reports.clear();
        path_ = dir_.file("g.grd");
    }
    void TearDown() override {
        DebugFileIO(0);
        grdDebugOn(0);
        grdInitSystem();
    }

    // A gridded file holding block 5 with an integer*2 record {1, 2, 3},
    // then a lone integer*2 record {4}.
    void writeSample() {
        FileHandle f = FOpenFileCreate(path_.c_str(), 1);
        ASSERT_NE(f, nullptr);
        const int16_t shorts[3] = {1, 2, 3};
        LrecNode* block = FCreateLogicalBlock(RCF_INT2, 3, shorts);
        ASSERT_EQ(grdCheckWriteLB(nullptr, 5, block, f, "t", 1), 0);
        FFreeLogicalBlock(block);
        const int16_t four = 4;
        ASSERT_EQ(grdCheckWriteLR(nullptr, RCF_INT2, 1, &four, f, "t", 2), 0);
        ASSERT_EQ(FCloseFile(&f), 0);
        EXPECT_EQ(f, nullptr);
    }

    FileHandle openSample() {
        writeSample();
        int32_t status = 0;
        return FOpenFileRead(path_.c_str(), &status);
    }

    TempDir dir_;
    std::string path_;
};

}  // namespace

TEST_F(FileIo, GriddedFilesCarryTheirTagAndOwnerMark) {
    uint32_t version = 0;
    const uint32_t tag = grdAppIdent(&version);
    EXPECT_EQ(std::memcmp(&tag, "GRD_", 4), 0);
    EXPECT_EQ(version, 206u);

    FileHandle f = FOpenFileCreate(path_.c_str(), 1);
    ASSERT_NE(f, nullptr);
    EXPECT_EQ(f->ownerMark, 1u);
    EXPECT_EQ(rcfGetRCFbase(f), 82u);
    EXPECT_EQ(rcfGetAppBase(f), 130u);
    EXPECT_EQ(FCloseFile(&f), 0);
    const auto b = readBytes(path_);
    EXPECT_EQ(std::string(b.begin() + 64, b.begin() + 81), "  FOpenFileCreate");

    int32_t status = -1;
    f = FOpenFileRead(path_.c_str(), &status);
    ASSERT_NE(f, nullptr);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(f->ownerMark, 1u);
    EXPECT_EQ(f->readOnly, 1u);
    EXPECT_EQ(rcfGetVersionCreateApp(f), 206u);
    EXPECT_EQ(FCloseFile(&f), 0);

    f = FOpenFileEdit(path_.c_str(), &status);
    ASSERT_NE(f, nullptr);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(f->readOnly, 0u);
    EXPECT_EQ(FCloseFile(&f), 0);
    EXPECT_EQ(FCloseFile(&f), 0);  // already closed
    EXPECT_TRUE(g_reports.empty());
}

TEST_F(FileIo, RecordLayerFailuresReachTheHandlers) {
    int32_t status = 0;
    EXPECT_EQ(FOpenFileRead(dir_.file("missing.grd").c_str(), &status), nullptr);
    EXPECT_EQ(status, F_ERR_OPEN);
    ASSERT_EQ(g_reports.size(), 1u);
    EXPECT_EQ(g_reports[0].code, F_ERR_OPEN);
    EXPECT_EQ(g_reports[0].module, "..\\grd\\fileio");
    EXPECT_EQ(g_reports[0].file, nullptr);

    // A cross-section file is not a gridded file.
    FileHandle xs = nullptr;
    ASSERT_EQ(rcfFileOpenCreate(path_.c_str(), "", &xs, crossSectionApp, 1), 0);
    rcfFileClose(&xs);
    EXPECT_EQ(FOpenFileEdit(path_.c_str(), &status), nullptr);
    EXPECT_EQ(status, F_ERR_APP_TAG);
    EXPECT_EQ(FOpenFileCreate(dir_.file("no/such/dir.grd").c_str(), 1), nullptr);
    ASSERT_EQ(g_reports.size(), 3u);
    EXPECT_EQ(g_reports[1].code, F_ERR_APP_TAG);
    EXPECT_EQ(g_reports[2].code, F_ERR_OPEN);

    writeSample();
    FileHandle f = FOpenFileRead(path_.c_str(), &status);
    ASSERT_NE(f, nullptr);
    EXPECT_EQ(FSkipLogicalBlock(f), 0);
    EXPECT_EQ(FSkipLogicalBlock(f), F_ERR_NOT_BLOCK);
    ASSERT_EQ(g_reports.size(), 4u);
    EXPECT_EQ(g_reports[3].code, F_ERR_NOT_BLOCK);
    EXPECT_EQ(g_reports[3].file, f);
    rcfGetError(f);
    EXPECT_EQ(FReadLogicalBlock(f), nullptr);  // a data record, not a block
    EXPECT_EQ(g_reports.back().code, F_ERR_SKIP);
    FCloseFile(&f);
}

TEST_F(FileIo, BlocksThroughTheFileLayer) {
    FileHandle f = openSample();
    ASSERT_NE(f, nullptr);
    EXPECT_EQ(FQueryLogicalBlock(f), 5);
    EXPECT_EQ(FQueryLogicalBlock(f), 5);  // nothing consumed
    LrecNode* block = FReadLogicalBlock(f);
    ASSERT_NE(block, nullptr);
    EXPECT_EQ(block->count, 3u);
    EXPECT_EQ(static_cast<int16_t*>(block->data)[2], 3);
    EXPECT_EQ(FAppendToLogicalBlock(RCF_BYTE, 2, nullptr, block), 0);
    ASSERT_NE(block->next, nullptr);
    EXPECT_EQ(block->next->count, 2u);
    EXPECT_EQ(FAppendToLogicalBlock(RCF_BYTE, 2, nullptr, nullptr), F_ERR_ARGUMENT);
    EXPECT_EQ(FFreeLogicalBlock(block), 0);

    const int64_t before = rcfTell64(f);
    EXPECT_EQ(FQueryLogicalBlock(f), 0);  // a data record: 0, nothing consumed
    EXPECT_EQ(rcfTell64(f), before);
    EXPECT_EQ(FReadLogicalBlock(f), nullptr);
    EXPECT_EQ(rcfGetError(f), F_ERR_SKIP);
    FCloseFile(&f);
}

TEST_F(FileIo, TracesUnderTheFileIoFlagOnly) {
    writeSample();
    testing::internal::CaptureStdout();
    int32_t status = 0;
    FileHandle quiet = FOpenFileRead(path_.c_str(), &status);
    FCloseFile(&quiet);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");

    EXPECT_EQ(DebugFileIO(7), 1);
    testing::internal::CaptureStdout();
    FileHandle f = FOpenFileRead(path_.c_str(), &status);
    const std::string handle = pointerText(f);
    const std::string name = rcfGetFilename(f);
    FQueryLogicalBlock(f);
    LrecNode* block = FReadLogicalBlock(f);
    const std::string list = pointerText(block);
    FFreeLogicalBlock(block);
    FCloseFile(&f);
    const TraceLines lines = splitTrace(testing::internal::GetCapturedStdout());
    DebugFileIO(0);

    const std::vector<std::string> expected = {
        "->{FOpenFileRead <" + path_ + ">",
        "<-}FOpenFileRead " + handle + " [0]",
        "->{FQueryLogicalBlock",
        "<-}FQueryLogicalBlock 5 &d",
        "->{FReadLogicalBlock",
        "<-}FReadLogicalBlock [0] " + list,
        "->{FFreeLogicalBlock",
        "<-}FFreeLogicalBlock [0]",
        "->{FCloseFile Fp->filname=<" + name + ">",
        "<-}FCloseFile " + handle + " [0]",
    };
    EXPECT_EQ(lines.text, expected);
    for (size_t i = 0; i + 1 < lines.indent.size(); i += 2) EXPECT_EQ(lines.indent[i], lines.indent[i + 1]);
}

TEST_F(FileIo, CheckedTransfersTraceUnderTheApiFlag) {
    grdDebugOn(1);
    testing::internal::CaptureStdout();
    grdCheckTypeSize(nullptr, nullptr, RCF_INT2, 0, "t", 1);
    grdCheckPseudoSkipLR(RCF_DOUBLE, 3, nullptr);
    const TraceLines lines = splitTrace(testing::internal::GetCapturedStdout());
    grdDebugOn(0);
    const std::vector<std::string> expected = {"->{grdCheckTypeSize", "<-}grdCheckTypeSize [2001]",
                                               "->{grdCheckPseudoSkipLR", "<-}grdCheckPseudoSkipLR [0]"};
    EXPECT_EQ(lines.text, expected);
}

TEST_F(FileIo, TypeSizeCheck) {
    const int16_t shorts[3] = {1, 2, 3};
    LrecNode* block = FCreateLogicalBlock(RCF_INT2, 3, shorts);
    ASSERT_NE(block, nullptr);
    auto* header = reinterpret_cast<HeaderHandle>(0x40);
    EXPECT_EQ(grdCheckTypeSize(header, block, RCF_INT2, 0, "..\\grd\\grdheader", 11), 0);  // any count
    EXPECT_EQ(grdCheckTypeSize(header, block, RCF_INT2, 3, "m", 12), 0);
    EXPECT_EQ(grdCheckTypeSize(header, block, RCF_INT2, 4, "m", 13), F_ERR_SIZE);
    EXPECT_EQ(grdCheckTypeSize(header, block, RCF_DOUBLE, 4, "m", 14), F_ERR_TYPE);  // type before count
    EXPECT_EQ(grdCheckTypeSize(header, nullptr, RCF_INT2, 3, "m", 15), F_ERR_READ);
    ASSERT_EQ(g_reports.size(), 3u);
    EXPECT_EQ(g_reports[0].code, F_ERR_SIZE);
    EXPECT_EQ(g_reports[0].header, header);
    EXPECT_EQ(g_reports[0].module, "m");
    EXPECT_EQ(g_reports[0].line, 13);
    EXPECT_EQ(g_reports[1].code, F_ERR_TYPE);
    EXPECT_EQ(g_reports[2].code, F_ERR_READ);
    FFreeLogicalBlock(block);
}

TEST_F(FileIo, CheckedRecordTransfers) {
    FileHandle f = openSample();
    ASSERT_NE(f, nullptr);
    // Reading skips and reads take the pending error.
    int16_t shorts[3] = {};
    EXPECT_EQ(grdCheckReadLR(nullptr, RCF_INT2, 3, shorts, f, "m", 1), F_ERR_SKIP);  // a block start
    EXPECT_EQ(rcfPeekError(f), 0);
    EXPECT_EQ(grdCheckSkipLR(nullptr, f, "m", 2), F_ERR_SKIP);  // the block start itself
    EXPECT_EQ(grdCheckSkipLR(nullptr, f, "m", 3), 0);
    EXPECT_EQ(grdCheckSkipLR(nullptr, f, "m", 4), F_ERR_SKIP);  // the terminator
    double d = 0;
    EXPECT_EQ(grdCheckReadLR(nullptr, RCF_DOUBLE, 1, &d, f, "m", 5), F_ERR_TYPE);
    EXPECT_EQ(rcfPeekError(f), 0);
    rcfSeek64(f, 130 + 3 + 11 + 1, 0, 0);
    EXPECT_EQ(grdCheckReadLR(nullptr, RCF_INT2, 3, shorts, f, "m", 6), 0);
    EXPECT_EQ(shorts[0], 4);
    const size_t reports = g_reports.size();
    EXPECT_EQ(grdCheckReadLR(nullptr, RCF_INT2, 3, shorts, f, "m", 7), F_EOF);  // no handler for 1
    EXPECT_EQ(grdCheckSkipLR(nullptr, f, "m", 8), F_EOF);
    EXPECT_EQ(g_reports.size(), reports);
    EXPECT_EQ(grdCheckWriteLR(nullptr, RCF_INT2, 1, shorts, f, "m", 9), F_ERR_READONLY);
    EXPECT_EQ(g_reports.back().code, F_ERR_READONLY);
    EXPECT_EQ(g_reports.back().file, f);
    EXPECT_EQ(grdCheckReadLR(nullptr, RCF_INT2, 3, shorts, nullptr, "m", 10), F_ERR_ARGUMENT);

    // A pseudo-skip moves over a record of known type and count unread.
    rcfGetError(f);
    rcfSeekAppBase(f);
    const int64_t before = rcfTell64(f);
    EXPECT_EQ(grdCheckPseudoSkipLR(RCF_DOUBLE, 3, f), 0);
    EXPECT_EQ(rcfTell64(f), before + 29);
    FCloseFile(&f);
}

TEST_F(FileIo, CheckedBlockTransfers) {
    FileHandle f = openSample();
    ASSERT_NE(f, nullptr);
    LrecNode* block = nullptr;
    uint16_t id = 0;
    EXPECT_EQ(grdCheckReadLB(nullptr, f, &block, &id, "m", 1), 0);
    EXPECT_EQ(id, 5);
    ASSERT_NE(block, nullptr);
    FFreeLogicalBlock(block);
    EXPECT_EQ(grdCheckReadLB(nullptr, f, &block, &id, "m", 2), F_ERR_SKIP);  // a lone record
    EXPECT_EQ(block, nullptr);
    rcfSkip(f);
    const size_t reports = g_reports.size();
    EXPECT_EQ(grdCheckReadLB(nullptr, f, &block, nullptr, "m", 3), F_EOF);
    EXPECT_EQ(g_reports.size(), reports);

    rcfSeekAppBase(f);
    EXPECT_EQ(grdCheckReadTypeSize(nullptr, f, RCF_INT2, 3, &block, "m", 4), 0);
    ASSERT_NE(block, nullptr);
    FFreeLogicalBlock(block);
    rcfSeekAppBase(f);
    EXPECT_EQ(grdCheckReadTypeSize(nullptr, f, RCF_FLOAT, 0, &block, "m", 5), F_ERR_TYPE);
    FFreeLogicalBlock(block);
    EXPECT_EQ(grdCheckReadTypeSize(nullptr, nullptr, RCF_FLOAT, 0, &block, "m", 6), F_ERR_ARGUMENT);
    EXPECT_EQ(block, nullptr);
    EXPECT_EQ(grdCheckWriteLB(nullptr, 1, nullptr, f, "m", 7), F_ERR_READONLY);
    FCloseFile(&f);
}
