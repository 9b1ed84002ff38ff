// Record lists and logical blocks: node ownership, block bytes, reading a
// block back whole, blocks cut short, skipping whole blocks.
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "rcf_testutil.h"

using namespace rcftest;
using testutil::readBytes;
using testutil::TempDir;

namespace {

class Blocks : public testing::Test {
protected:
    void SetUp() override {
        path_ = dir_.file("b.rcf");
        ASSERT_EQ(rcfFileOpenCreate(path_.c_str(), "", f_.out(), testApp, 1), 0);
        base_ = rcfGetAppBase(f_);
    }
    std::vector<uint8_t> bytesAfterBase() {
        rcfTell64(f_);
        std::fflush(f_.get()->stream);
        const auto b = readBytes(path_);
        return {b.begin() + base_, b.end()};
    }

    TempDir dir_;
    std::string path_;
    File f_;
    int64_t base_ = 0;
};

}  // namespace

TEST(RcfNodes, CopyShareAppendAndDetach) {
    const int32_t values[2] = {5, -6};
    LrecNode* list = rcfLrecNodeNew(RCF_INT4, 2, values, 1, nullptr);
    ASSERT_NE(list, nullptr);
    EXPECT_NE(list->data, static_cast<const void*>(values));
    EXPECT_EQ(list->ownsData, 1u);
    EXPECT_EQ(static_cast<int32_t*>(list->data)[1], -6);

    LrecNode* zeroed = rcfLrecNodeNew(RCF_DOUBLE, 3, nullptr, 1, list);
    ASSERT_NE(zeroed, nullptr);
    EXPECT_EQ(list->next, zeroed);
    EXPECT_EQ(static_cast<double*>(zeroed->data)[2], 0.0);

    LrecNode* shared = rcfLrecNodeNew(RCF_INT4, 2, values, 0, list);  // linked after the last node
    ASSERT_NE(shared, nullptr);
    EXPECT_EQ(zeroed->next, shared);
    EXPECT_EQ(shared->data, static_cast<const void*>(values));
    EXPECT_EQ(shared->ownsData, 0u);

    LrecNode* empty = rcfLrecNodeNew(RCF_FLOAT, 0, nullptr, 1, list);  // size 0: a node without data
    ASSERT_NE(empty, nullptr);
    EXPECT_EQ(empty->data, nullptr);

    void* kept = rcfLrecDetachData(list);
    EXPECT_EQ(list->data, nullptr);
    rcfLrecListFree(&list);
    EXPECT_EQ(list, nullptr);
    EXPECT_EQ(static_cast<int32_t*>(kept)[0], 5);  // still ours after the list is gone
    rcfLrecFree(&kept);
    rcfLrecListFree(nullptr);
}

TEST_F(Blocks, EmptyBlockIsFourBytesAndReadsBackEmpty) {
    ASSERT_EQ(rcfBlockWrite(0x9C41, f_, nullptr), 0);
    EXPECT_EQ(bytesAfterBase(), (std::vector<uint8_t>{0xFE, 0x41, 0x9C, 0xFF}));
    rcfSeekAppBase(f_);
    uint32_t nodes = 5;
    LrecNode* list = nullptr;
    EXPECT_EQ(rcfBlockRead(f_, &nodes, &list), 0x9C41);
    EXPECT_EQ(nodes, 0u);
    EXPECT_EQ(list, nullptr);
    EXPECT_EQ(rcfPeekError(f_), 0);
    EXPECT_EQ(f_.get()->inBlock, 0u);
    EXPECT_EQ(rcfTell64(f_), base_ + 4);
}

TEST_F(Blocks, RecordsRoundTripInOrder) {
    const int16_t shorts[3] = {1, 2, 3};
    const double d = 6.25;
    LrecNode* out = rcfLrecNodeNew(RCF_INT2, 3, shorts, 1, nullptr);
    rcfLrecNodeNew(RCF_DOUBLE, 1, &d, 0, out);
    ASSERT_EQ(rcfBlockWrite(7, f_, out), 0);
    rcfLrecListFree(&out);
    const int32_t after = 99;
    ASSERT_EQ(rcfLrecWrite(f_, RCF_INT4, 1, &after), 0);
    EXPECT_EQ(bytesAfterBase().size(), 3u + 11 + 13 + 1 + 9);

    rcfSeekAppBase(f_);
    uint32_t nodes = 0;
    LrecNode* list = nullptr;
    EXPECT_EQ(rcfBlockRead(f_, &nodes, &list), 7);
    ASSERT_EQ(nodes, 2u);
    ASSERT_NE(list, nullptr);
    EXPECT_EQ(list->type, RCF_INT2);
    EXPECT_EQ(list->count, 3u);
    EXPECT_EQ(list->ownsData, 1u);
    EXPECT_EQ(static_cast<int16_t*>(list->data)[2], 3);
    ASSERT_NE(list->next, nullptr);
    EXPECT_EQ(list->next->type, RCF_DOUBLE);
    EXPECT_EQ(*static_cast<double*>(list->next->data), 6.25);
    EXPECT_EQ(list->next->next, nullptr);
    rcfLrecListFree(&list);
    // The terminator was consumed: the next record follows.
    int32_t v = 0;
    EXPECT_EQ(rcfLrecRead(f_, RCF_INT4, 1, &v), 1u);
    EXPECT_EQ(v, 99);
}

TEST_F(Blocks, BlocksCutShortOrMissing) {
    // A block start and one record, then end of file.
    const uint8_t start = 0xFE;
    const uint16_t id = 3;
    rcfWriteRaw(const_cast<uint8_t*>(&start), 1, 1, f_);
    rcfWriteRaw(const_cast<uint16_t*>(&id), 2, 1, f_);
    const float x = 1.5f;
    ASSERT_EQ(rcfLrecWrite(f_, RCF_FLOAT, 1, &x), 0);
    rcfSeekAppBase(f_);
    uint32_t nodes = 0;
    LrecNode* list = nullptr;
    EXPECT_EQ(rcfBlockRead(f_, &nodes, &list), 3);
    EXPECT_EQ(nodes, 1u);
    ASSERT_NE(list, nullptr);
    EXPECT_EQ(*static_cast<float*>(list->data), 1.5f);
    rcfLrecListFree(&list);
    EXPECT_EQ(rcfGetError(f_), F_ERR_SKIP);
    EXPECT_EQ(f_.get()->inBlock, 0u);

    // No block here: the record stays for the next reader.
    rcfSeek64(f_, static_cast<uint32_t>(base_ + 3), 0, 0);
    EXPECT_EQ(rcfBlockRead(f_, &nodes, &list), 0);
    EXPECT_EQ(nodes, 0u);
    EXPECT_EQ(list, nullptr);
    EXPECT_EQ(rcfGetError(f_), F_ERR_SKIP);
    EXPECT_EQ(rcfQuery(f_, nullptr), RCF_FLOAT);

    // A nested block start ends the read as well.
    rcfSeek64(f_, 0, 0, 2);
    rcfWriteRaw(const_cast<uint8_t*>(&start), 1, 1, f_);
    rcfWriteRaw(const_cast<uint16_t*>(&id), 2, 1, f_);
    ASSERT_EQ(rcfBlockWrite(4, f_, nullptr), 0);
    rcfSeek64(f_, static_cast<uint32_t>(base_ + 3 + 9), 0, 0);
    EXPECT_EQ(rcfBlockRead(f_, &nodes, &list), 3);
    EXPECT_EQ(rcfGetError(f_), F_ERR_SKIP);
}

TEST_F(Blocks, SkipPassesAWholeBlockOrRefusesARecord) {
    const int32_t v = 1;
    LrecNode* list = rcfLrecNodeNew(RCF_INT4, 1, &v, 1, nullptr);
    rcfLrecNodeNew(RCF_INT4, 1, &v, 1, list);
    ASSERT_EQ(rcfBlockWrite(1, f_, list), 0);
    rcfLrecListFree(&list);
    ASSERT_EQ(rcfLrecWrite(f_, RCF_INT4, 1, &v), 0);
    rcfSeekAppBase(f_);
    EXPECT_EQ(rcfBlockSkip(f_), 0);
    EXPECT_EQ(rcfTell64(f_), base_ + 3 + 9 + 9 + 1);
    EXPECT_EQ(rcfBlockSkip(f_), F_ERR_NOT_BLOCK);
    EXPECT_EQ(rcfGetError(f_), F_ERR_NOT_BLOCK);
    EXPECT_EQ(rcfQuery(f_, nullptr), RCF_INT4);  // nothing consumed
}
