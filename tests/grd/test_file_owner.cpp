// A file handle belongs to the header it was created with or read into: the
// data, positioning and lifecycle calls refuse the header of another file
// and leave both files as they were.
#include <string>
#include <vector>

#include "test_lifecycle_support.h"

namespace {

using grdtest::Codes;
using grdtest::FileTest;

class FileOwner : public FileTest {};

TEST_F(FileOwner, AFileRefusesTheHeaderOfAnotherFile) {
    // a.grd: two float items; the other header: three items of another
    // layout, writing b.grd.
    makeFileHeader(2);
    const std::string a = dir_.file("a.grd"), b = dir_.file("b.grd");
    create(a);
    HeaderHandle other = nullptr;
    ASSERT_EQ(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "other", "app", 1, 3, 1, &other), 0);
    ASSERT_EQ(grdSetEqTimeAxis(other, QTY_UNIT_SECOND, 0.0, 1.0, 0), 0);
    for (int32_t i = 1; i <= 3; ++i) {
        ASSERT_EQ(grdSetItemInfo(other, grdItemD(other, i), QTY_ITEM_UNDEFINED, "x", 0, RCF_DOUBLE), 0);
        ASSERT_EQ(grdSetItemAxisEqD1(grdItemD(other, i), 0, 4, 0.0f, 1.0f), 0);
    }
    FileHandle otherFile = nullptr;
    ASSERT_EQ(grdFileCreate(b.c_str(), other, &otherFile), 0);

    const float step[2] = {1.5f, 2.5f};
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, &step[0]), 0);
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, &step[1]), 0);
    ASSERT_EQ(std::fflush(file_->stream), 0);
    const std::vector<uint8_t> before = testutil::readBytes(a);
    takeCodes();

    const double values[4] = {1, 2, 3, 4};
    double time = 0;
    EXPECT_EQ(grdWriteItemTimeStep(other, file_, 0.0, values), 1000);
    EXPECT_EQ(grdWriteStartBlockDynamic(other, file_), 1000);
    EXPECT_EQ(grdSkipItem(other, file_), 1000);
    EXPECT_EQ(grdReadItemTimeStep(header_, otherFile, &time, nullptr), 1000);
    EXPECT_EQ(grdFindTimeStep(other, file_, 0), 1000);
    EXPECT_EQ(grdFileFlush(other, file_), 1000);
    EXPECT_EQ(grdFileClose(other, &file_), 1000);
    EXPECT_EQ(takeCodes(), Codes(7, 1000));
    ASSERT_NE(file_, nullptr);  // still open
    EXPECT_EQ(other->nextItem, 0);
    EXPECT_EQ(other->timeStepsDone, 0);
    ASSERT_EQ(std::fflush(file_->stream), 0);
    EXPECT_EQ(testutil::readBytes(a), before);

    // Both files are whole after their own closes.
    ASSERT_EQ(grdFileClose(other, &otherFile), 0);
    grdHeaderDestroy(&other);
    close();
    openRead(a);
    int32_t steps = 0;
    ASSERT_EQ(grdGetEqTimeAxis(header_, nullptr, nullptr, nullptr, nullptr, &steps, nullptr), 0);
    EXPECT_EQ(steps, 1);
    float read[2] = {};
    ASSERT_EQ(grdReadItemTimeStep(header_, file_, &time, &read[0]), 0);
    ASSERT_EQ(grdReadItemTimeStep(header_, file_, &time, &read[1]), 0);
    EXPECT_EQ(read[0], 1.5f);
    EXPECT_EQ(read[1], 2.5f);

    // A header destroyed and replaced by a new one (even at the same
    // address) does not own the file either.
    HeaderHandle copy = nullptr;
    ASSERT_EQ(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "copy", "app", 1, 2, 1, &copy), 0);
    EXPECT_EQ(grdFindTimeStep(copy, file_, 0), 1000);
    grdHeaderDestroy(&copy);
}

}  // namespace
