// Test support for the static-item and file-lifecycle tests: a fixture with a
// private folder and a header that the header writer accepts, and helpers
// that build static items and walk the static section of a file.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "common/testutil.h"
#include "grd/fileio.h"
#include "grd/grdheader.h"
#include "grd/grdstatic.h"
#include "grd/grdstream.h"
#include "qty/qty.h"
#include "test_header_support.h"
#include "tova/grd.h"

namespace grdtest {

// A static item that is destroyed at the end of the scope.
class StaticItem {
public:
    StaticItem() { EXPECT_EQ(grdStaticCreate(&item_), 0); }
    explicit StaticItem(ItemHandle adopted) : item_(adopted) {}
    ~StaticItem() {
        if (item_ != nullptr) grdStaticDestroy(&item_);
    }
    StaticItem(const StaticItem&) = delete;
    StaticItem& operator=(const StaticItem&) = delete;
    ItemHandle get() const { return item_; }
    ItemHandle* out() { return &item_; }
    explicit operator bool() const { return item_ != nullptr; }

private:
    ItemHandle item_ = nullptr;
};

// Unit keys by their texts.
inline int32_t unitTag(const char* text) {
    int32_t unit = 0;
    EXPECT_NE(qtyGetUnitTag(text, &unit), 0) << text;
    return unit;
}

class FileTest : public GrdTest {
protected:
    void TearDown() override {
        if (file_ != nullptr) rcfFileClose(&file_);
        GrdTest::TearDown();
    }

    // A header that the writer accepts: equidistant time axis, n float items
    // with info (0-D axis).
    HeaderHandle makeFileHeader(int32_t n = 2, int32_t fileType = F_EQTIME_FIXEDSPACE_ALLITEMS) {
        makeHeader(fileType, n, 1);
        if (fileType == F_EQTIME_FIXEDSPACE_ALLITEMS || fileType == F_EQTIME_TVARSPACE_ALLITEMS) {
            EXPECT_EQ(grdSetEqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 60.0, 0), 0);
        } else {
            EXPECT_EQ(grdSetNeqTimeAxis(header_, QTY_UNIT_SECOND, 0.0, 0), 0);
        }
        for (int32_t i = 1; i <= n; ++i) {
            const std::string name = "item " + std::to_string(i);
            EXPECT_EQ(grdSetItemInfo(header_, grdItemD(header_, i), QTY_ITEM_UNDEFINED, name.c_str(), 0, 1), 0);
        }
        return header_;
    }

    // Creates path from the fixture's header into file_.
    void create(const std::string& path) { ASSERT_EQ(grdFileCreate(path.c_str(), header_, &file_), 0); }
    void close() {
        ASSERT_EQ(grdFileClose(header_, &file_), 0);
        EXPECT_EQ(file_, nullptr);
    }
    // Opens path for reading into the fixture's header and file.
    void openRead(const std::string& path) {
        if (header_ != nullptr) grdHeaderDestroy(&header_);
        ASSERT_EQ(grdFileRead(path.c_str(), &header_, &file_), 0);
    }

    // A float static item of one value (0-D axis) named name.
    void describeScalar(ItemHandle item, const char* name) {
        ASSERT_EQ(grdSetItemInfo(header_, item, QTY_ITEM_UNDEFINED, name, 0, RCF_FLOAT), 0);
        ASSERT_EQ(grdSetItemAxisEqD0(item, 0), 0);
    }

    testutil::TempDir dir_;
    FileHandle file_ = nullptr;
};

// Fills a static item: info with the fixture header, then an axis set by fn.
template <class Axis>
void describe(HeaderHandle header, ItemHandle item, const char* name, int32_t itemType, int32_t unit,
              int32_t dataType, Axis axis) {
    ASSERT_EQ(grdSetItemInfo(header, item, itemType, name, unit, dataType), 0);
    ASSERT_EQ(axis(item), 0);
}

// The names of the static items that follow the header of path, read with
// the internal reader (the lifecycle would consume the encoding keys).
inline std::vector<std::string> staticNames(const std::string& path) {
    std::vector<std::string> names;
    int32_t status = 0;
    FileHandle file = FOpenFileRead(path.c_str(), &status);
    EXPECT_NE(file, nullptr);
    if (file == nullptr) return names;
    HeaderHandle header = grdReadHeader(file, &status);
    EXPECT_EQ(status, 0);
    for (;;) {
        ItemHandle item = grdStaticRead(file, &status);
        if (item == nullptr) break;
        const char* name = nullptr;
        grdGetItemInfo_(item, nullptr, &name, nullptr, nullptr);
        names.emplace_back(name != nullptr ? name : "");
        grdStaticDestroy(&item);
    }
    EXPECT_EQ(status, 0);
    if (header != nullptr) grdHeaderDestroy(&header);
    FCloseFile(&file);
    return names;
}

}  // namespace grdtest
