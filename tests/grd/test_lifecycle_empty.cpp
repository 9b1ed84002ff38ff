// Files closed or flushed before any data section began: they end their
// header with an empty dynamic section, read back with no time steps, take
// appended time steps, and a flush in that state leaves no trace once data
// follow.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "test_lifecycle_support.h"

using namespace grdtest;

namespace {

class EmptyFileTest : public FileTest {
protected:
    void writeSteps(int32_t steps) {
        for (int32_t t = 0; t < steps; ++t) {
            for (int32_t i = 1; i <= grdGetNoOfItems(header_); ++i) {
                const float v = static_cast<float>(100 * header_->timeStepsDone + i);
                ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, &v), 0);
            }
        }
    }
    // The values of every time step of path as its header counts them.
    std::vector<float> readAll(const std::string& path, int32_t* steps) {
        openRead(path);
        std::vector<float> values;
        grdGetEqTimeAxis(header_, nullptr, nullptr, nullptr, nullptr, steps, nullptr);
        for (int32_t t = 0; t < *steps; ++t) {
            for (int32_t i = 1; i <= grdGetNoOfItems(header_); ++i) {
                double time = 0;
                float v = 0;
                EXPECT_EQ(grdReadItemTimeStep(header_, file_, &time, &v), 0);
                values.push_back(v);
            }
        }
        close();
        return values;
    }
    // The bytes after the record-file header (its stamps differ between files).
    std::vector<unsigned char> dataBytes(const std::string& path) {
        const std::vector<unsigned char> all = testutil::readBytes(path);
        openRead(path);
        const size_t base = file_->appBase;
        close();
        return {all.begin() + static_cast<std::ptrdiff_t>(base), all.end()};
    }
};

TEST_F(EmptyFileTest, HeaderOnlyFileReadsBackAndTakesAppendedSteps) {
    makeFileHeader(2);
    ASSERT_EQ(grdSetFileTitle(header_, "nothing yet"), 0);
    const std::string path = dir_.file("empty.grd");
    create(path);
    close();

    // The header ends with an empty dynamic section: 0xFE, 50000, 0xFF.
    const std::vector<unsigned char> bytes = testutil::readBytes(path);
    ASSERT_GE(bytes.size(), 4u);
    const std::vector<unsigned char> tail(bytes.end() - 4, bytes.end());
    EXPECT_EQ(tail, (std::vector<unsigned char>{0xFE, 0x50, 0xC3, 0xFF}));

    int32_t steps = -1;
    EXPECT_TRUE(readAll(path, &steps).empty());
    EXPECT_EQ(steps, 0);
    openRead(path);
    EXPECT_STREQ(grdGetFileTitle(header_), "nothing yet");
    EXPECT_EQ(grdGetNoOfItems(header_), 2);
    close();

    grdHeaderDestroy(&header_);
    ASSERT_EQ(grdFileAppend(path.c_str(), &header_, &file_), 0);
    writeSteps(3);
    close();
    const std::vector<float> values = readAll(path, &steps);
    EXPECT_EQ(steps, 3);
    EXPECT_EQ(values, (std::vector<float>{1, 2, 101, 102, 201, 202}));
    EXPECT_EQ(takeCodes(), Codes{});
}

// A flush before any data makes the file readable at that moment; whatever
// is written next (static items or time steps) leaves the file byte for
// byte as it would be without that flush.
TEST_F(EmptyFileTest, FlushBeforeAnyDataLeavesNoTrace) {
    const float s = 7.0f;
    const auto make = [&](const std::string& path, bool flush, bool withStatic) {
        makeFileHeader(1);
        create(path);
        if (flush) {
            ASSERT_EQ(grdFileFlush(header_, file_), 0);
            int32_t steps = -1;
            HeaderHandle h = nullptr;
            FileHandle f = nullptr;
            ASSERT_EQ(grdFileRead(path.c_str(), &h, &f), 0);  // readable right after the flush
            grdGetEqTimeAxis(h, nullptr, nullptr, nullptr, nullptr, &steps, nullptr);
            EXPECT_EQ(steps, 0);
            grdFileClose(h, &f);
            grdHeaderDestroy(&h);
        }
        if (withStatic) {
            StaticItem item;
            describeScalar(item.get(), "s");
            ASSERT_EQ(grdStaticWrite(item.get(), file_, &s), 0);
        }
        writeSteps(2);
        close();
    };
    for (const bool withStatic : {false, true}) {
        const std::string plain = dir_.file(withStatic ? "plain_s.grd" : "plain.grd");
        const std::string flushed = dir_.file(withStatic ? "flushed_s.grd" : "flushed.grd");
        make(plain, false, withStatic);
        make(flushed, true, withStatic);
        EXPECT_EQ(dataBytes(plain), dataBytes(flushed)) << "with static items: " << withStatic;
        EXPECT_EQ(staticNames(flushed), withStatic ? std::vector<std::string>{"s"} : std::vector<std::string>{});
        int32_t steps = -1;
        EXPECT_EQ(readAll(flushed, &steps), (std::vector<float>{1, 101}));
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

}  // namespace
