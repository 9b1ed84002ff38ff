// Test support for the dynamic-data tests (time steps, positioning,
// statistics): a fixture that builds a header with items of several kinds,
// writes a data file and opens it again for reading, plus value generators
// and a look at the file's bytes.
#pragma once

#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "common/testutil.h"
#include "grd/fileio.h"
#include "grd/grdheader.h"
#include "test_header_support.h"

namespace dyntest {

using grdtest::Codes;

// WaterLevel and three of its units.
constexpr int32_t kWaterLevel = 40101;
constexpr int32_t kMetre = 20100;
constexpr int32_t kCentimetre = 20102;
constexpr int32_t kFoot = 20105;

// A value that differs per time step, item and element and is exact in float.
inline float floatValue(int32_t step, int32_t item, int64_t element) {
    return static_cast<float>(step * 1000 + item * 100) + static_cast<float>(element) * 0.25f;
}
inline double doubleValue(int32_t step, int32_t item, int64_t element) {
    return step * 1.0e6 + item * 1.0e3 + static_cast<double>(element) / 3.0;
}

class DynamicTest : public grdtest::GrdTest {
protected:
    void TearDown() override {
        closeFile();
        dropReadHeader();
        grdtest::GrdTest::TearDown();
    }

    void dropReadHeader() {
        if (readHeader_ != nullptr) grdHeaderDestroy(&readHeader_);
    }

    // Item itemNo as a float (or other data type) grid of nx x ny on an
    // equidistant 2-D axis; ny 0 gives a 1-D axis of nx, nx 0 a single value.
    ItemHandle defineItem(int32_t itemNo, int32_t dataType, int32_t nx, int32_t ny = 0,
                          int32_t itemType = QTY_ITEM_UNDEFINED, int32_t unit = 0) {
        ItemHandle item = grdItemD(header_, itemNo);
        EXPECT_EQ(grdSetItemInfo(header_, item, itemType, ("item " + std::to_string(itemNo)).c_str(), unit, dataType),
                  0);
        if (nx > 0 && ny > 0) {
            EXPECT_EQ(grdSetItemAxisEqD2(item, 0, nx, ny, 0.0f, 0.0f, 1.0f, 1.0f), 0);
        } else if (nx > 0) {
            EXPECT_EQ(grdSetItemAxisEqD1(item, 0, nx, 0.0f, 1.0f), 0);
        }
        return item;
    }

    std::string path() const { return dir_.file("data.grd"); }

    // Writes a static item of n floats first, first + 1, ... on an EqD1 axis.
    void writeStatic(int32_t n, float first) {
        ItemHandle item = nullptr;
        ASSERT_EQ(grdStaticCreate(&item), 0);
        ASSERT_EQ(grdSetItemInfo(header_, item, QTY_ITEM_UNDEFINED, "static", 0, RCF_FLOAT), 0);
        ASSERT_EQ(grdSetItemAxisEqD1(item, 0, n, 0.0f, 1.0f), 0);
        std::vector<float> values(static_cast<size_t>(n));
        for (int32_t k = 0; k < n; ++k) values[static_cast<size_t>(k)] = first + static_cast<float>(k);
        EXPECT_EQ(grdStaticWrite(item, file_, values.data()), 0);
        grdStaticDestroy(&item);
    }

    // Reads the next static item and gives its first value (-1 when none).
    float nextStaticFirstValue() {
        int32_t status = -1;
        ItemHandle item = grdStaticRead(file_, &status);
        EXPECT_EQ(status, 0);
        if (item == nullptr) return -1.0f;
        std::vector<float> values(static_cast<size_t>(grdGetItemElements(item)));
        EXPECT_EQ(grdStaticGetData(item, values.data()), 0);
        grdStaticDestroy(&item);
        return values.empty() ? -1.0f : values[0];
    }

    // Creates the data file of the fixture's header (readable while written).
    FileHandle create() {
        closeFile();
        dropReadHeader();
        EXPECT_EQ(grdFileCreateEx(path().c_str(), header_, &file_, 1), 0);
        fileHeader_ = header_;
        return file_;
    }

    // Closes the file (rewriting the header of a written file).
    void closeFile() {
        if (file_ == nullptr) return;
        EXPECT_EQ(grdFileClose(fileHeader_, &file_), 0);
        file_ = nullptr;
    }

    // Opens the written file for reading; rh() is its header.
    FileHandle reopen() {
        closeFile();
        dropReadHeader();
        EXPECT_EQ(grdFileRead(path().c_str(), &readHeader_, &file_), 0);
        fileHeader_ = readHeader_;
        return file_;
    }
    HeaderHandle rh() const { return readHeader_; }

    // Writes steps time steps of every item: item i, step s, element e holds
    // floatValue / doubleValue (other data types: the integer s*1000+i*100+e).
    // times[s] (default s * 10) is given with item 1; later items are given
    // another time, which is ignored.
    void writeSteps(int32_t steps, const std::vector<double>& times = {}) {
        for (int32_t s = 0; s < steps; ++s) {
            const double t = s < static_cast<int32_t>(times.size()) ? times[s] : s * 10.0;
            for (int32_t i = 1; i <= grdGetNoOfItems(header_); ++i) {
                std::vector<unsigned char> data = values(header_, s, i);
                const double given = i == 1 ? t : t + 1000.0;
                ASSERT_EQ(grdWriteItemTimeStep(header_, file_, given, data.data()), 0) << s << " " << i;
            }
        }
    }

    // The values that writeSteps gives item i at step s, as bytes of the
    // item's data type (its full element count).
    static std::vector<unsigned char> values(HeaderHandle h, int32_t s, int32_t i) {
        const GrdItem* item = grdHeaderItem(h, i);
        const int64_t n = grdItemElementCount(item);
        const int32_t size = grdSimpleTypeSize(item->dataType);
        std::vector<unsigned char> bytes(static_cast<size_t>(n * size));
        for (int64_t e = 0; e < n; ++e) {
            unsigned char* p = bytes.data() + e * size;
            if (item->dataType == RCF_FLOAT) {
                const float v = floatValue(s, i, e);
                std::memcpy(p, &v, sizeof(v));
            } else if (item->dataType == RCF_DOUBLE) {
                const double v = doubleValue(s, i, e);
                std::memcpy(p, &v, sizeof(v));
            } else {
                const int64_t v = s * 1000 + i * 100 + e;
                std::memcpy(p, &v, static_cast<size_t>(size));  // little-endian low bytes
            }
        }
        return bytes;
    }

    // Reads item i (the cursor's) of step s and checks its values and time.
    void expectStep(HeaderHandle h, int32_t s, int32_t i, double expectedTime) {
        const std::vector<unsigned char> expected = values(h, s, i);
        std::vector<unsigned char> got(expected.size() + 16, 0xAB);
        double time = -1;
        ASSERT_EQ(grdReadItemTimeStep(h, file_, &time, got.data()), 0) << "step " << s << " item " << i;
        EXPECT_EQ(time, expectedTime) << "step " << s << " item " << i;
        EXPECT_EQ(0, std::memcmp(got.data(), expected.data(), expected.size())) << "step " << s << " item " << i;
        for (size_t k = expected.size(); k < got.size(); ++k) ASSERT_EQ(got[k], 0xAB) << "written past the item";
    }

    testutil::TempDir dir_;
    FileHandle file_ = nullptr;
    HeaderHandle readHeader_ = nullptr;
    HeaderHandle fileHeader_ = nullptr;  // the header that goes with file_
};

// Offset of the first occurrence of pattern at or after from; npos when none.
inline size_t find(const std::vector<uint8_t>& bytes, const std::vector<uint8_t>& pattern, size_t from = 0) {
    if (pattern.size() > bytes.size()) return std::string::npos;
    for (size_t i = from; i + pattern.size() <= bytes.size(); ++i)
        if (std::memcmp(bytes.data() + i, pattern.data(), pattern.size()) == 0) return i;
    return std::string::npos;
}

}  // namespace dyntest
