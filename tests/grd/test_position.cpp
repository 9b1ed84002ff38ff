// Positioning: time steps forward (step by step and by the measured jump),
// backward and to the end; items of a time step; the range results 1001 and
// 1002 that reach no handler; files whose time steps differ in length; block
// searches; the span of a non-equidistant time axis.
#include <cstring>
#include <vector>

#include "test_dynamic_support.h"

namespace {

using dyntest::Codes;
using dyntest::DynamicTest;

class Position : public DynamicTest {
protected:
    // A type-4 file of three items and steps time steps at 10 * s + 0.5.
    void writeFile(int32_t steps) {
        makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 3, 1);
        ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
        defineItem(1, RCF_FLOAT, 3, 2);
        defineItem(2, RCF_DOUBLE, 5);
        defineItem(3, RCF_FLOAT, 0);
        create();
        std::vector<double> times;
        for (int32_t s = 0; s < steps; ++s) times.push_back(10.0 * s + 0.5);
        writeSteps(steps, times);
        reopen();
        ASSERT_EQ(grdParamModifyTimes(rh(), 0), 0);
    }
    double timeOf(int32_t s) const { return 10.0 * s + 0.5; }
};

TEST_F(Position, TimeStepsAreFoundFromAnyCursorPosition) {
    writeFile(12);
    // Every pair of steps, the cursor left inside a step in between.
    for (int32_t from = 0; from <= 11; ++from) {
        for (int32_t to = 0; to <= 11; ++to) {
            ASSERT_EQ(grdFindTimeStep(rh(), file_, from), 0) << from;
            expectStep(rh(), from, 1, timeOf(from));
            ASSERT_EQ(grdFindTimeStep(rh(), file_, to), 0) << from << " -> " << to;
            EXPECT_EQ(rh()->timeStepsDone, to);
            EXPECT_EQ(rh()->nextItem, 0);
            expectStep(rh(), to, 1, timeOf(to));
            expectStep(rh(), to, 2, timeOf(to));
        }
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(Position, TheEndIsAPositionAndBeyondItIsOutOfRange) {
    writeFile(7);
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 7), 0);  // after the last step
    EXPECT_EQ(rh()->timeStepsDone, 7);
    double time = 0;
    float buffer[8];
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, &time, buffer), 1);  // end of file
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 0), 0);
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 7), 0);  // a jump of seven steps
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, &time, buffer), 1);
    // Out of range: the status is returned, no handler is called.
    EXPECT_EQ(grdFindTimeStep(rh(), file_, 8), 1001);
    EXPECT_EQ(grdFindTimeStep(rh(), file_, -1), 1001);
    EXPECT_EQ(grdFindItemDynamic(rh(), file_, 8, 1), 1001);
    EXPECT_EQ(grdFindItemDynamic(rh(), file_, 2, 0), 1002);
    EXPECT_EQ(grdFindItemDynamic(rh(), file_, 2, 4), 1002);
    EXPECT_EQ(takeCodes(), Codes{});
    EXPECT_EQ(grdFindTimeStep(nullptr, file_, 1), 1000);
    EXPECT_EQ(grdFindTimeStep(rh(), nullptr, 1), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000}));
    // The cursor standing at the step is left alone.
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 3), 0);
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 3), 0);
    expectStep(rh(), 3, 1, timeOf(3));
}

TEST_F(Position, ItemsOfATimeStepAreFoundForwardAndBackward) {
    writeFile(10);
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 7, 3), 0);
    expectStep(rh(), 7, 3, timeOf(7));
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 7, 2), 0);  // back within the step
    expectStep(rh(), 7, 2, timeOf(7));
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 7, 3), 0);  // already there
    expectStep(rh(), 7, 3, timeOf(7));
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 8, 1), 0);
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 8, 3), 0);  // forward within the step
    expectStep(rh(), 8, 3, timeOf(8));
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 1, 2), 0);
    expectStep(rh(), 1, 2, timeOf(1));
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 9, 1), 0);
    expectStep(rh(), 9, 1, timeOf(9));
    EXPECT_EQ(takeCodes(), Codes{});
}

// A file whose third time step is longer than the others (a record of one
// element more): the measured jump lands mid-record, is caught, and the time
// step is reached by walking the records.
TEST_F(Position, AJumpIntoUnequalTimeStepsFallsBackToWalking) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 4);
    defineItem(2, RCF_FLOAT, 4);
    create();
    writeSteps(2);
    const int64_t stepTwo = rcfTell64(file_);
    writeSteps(10);  // steps 0-9 again after the first two: 12 steps, the last 10 repeat 0-9
    closeFile();

    std::vector<uint8_t> bytes = testutil::readBytes(path());
    const size_t record = static_cast<size_t>(stepTwo) + 4;  // after the empty 50001 block
    ASSERT_EQ(bytes[record], 0x01);
    ASSERT_EQ(bytes[record + 1], 0x04);
    bytes[record + 1] = 0x05;
    const float extra = 777.0f;
    const auto* p = reinterpret_cast<const uint8_t*>(&extra);
    bytes.insert(bytes.begin() + static_cast<std::ptrdiff_t>(record + 5 + 16), p, p + 4);
    testutil::writeBytes(path(), bytes);

    reopen();
    for (int32_t to : {8, 11, 5, 3, 4, 12, 1}) {
        ASSERT_EQ(grdFindTimeStep(rh(), file_, to), 0) << to;
        if (to == 12) continue;  // the end
        const int32_t written = to < 2 ? to : to - 2;  // what writeSteps gave this step
        std::vector<float> got(4);
        double time = -1;
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, &time, got.data()), 0) << to;
        EXPECT_EQ(time, to);
        for (int e = 0; e < 4; ++e) EXPECT_EQ(got[e], dyntest::floatValue(written, 1, e)) << to;
    }
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 2), 0);
    std::vector<float> got(4 + 4, 7.0f);
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, got.data()), 2013);  // the long record itself
    EXPECT_EQ(got[4], 7.0f);
    EXPECT_EQ(takeCodes(), Codes{2013});
}

TEST_F(Position, BlockSearchesStopAtTheirSection) {
    writeFile(3);
    EXPECT_EQ(grdFindBlock(nullptr, 50000), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});
    // No static items: the search for them ends past the dynamic start.
    ASSERT_EQ(grdFindBlock(file_, 40000), 0);
    EXPECT_EQ(file_->ownerMark, 3u);
    // Any other block is looked for in the header: the search ends with the
    // first block passed in the dynamic data.
    EXPECT_EQ(grdFindBlock(file_, 12345), 0);
    ASSERT_EQ(grdFindBlockStatic(rh(), file_), 0);
    EXPECT_EQ(rh()->timeStepsDone, 0);
    expectStep(rh(), 0, 1, timeOf(0));
    ASSERT_EQ(grdFindBlockDynamic(rh(), file_), 0);
    expectStep(rh(), 0, 1, timeOf(0));
    ASSERT_EQ(grdFindBlock(file_, 50000), 0);
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(Position, StaticItemsAreFoundBeforeAndAfterTheDynamicData) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 2, 1);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_FLOAT, 3);
    defineItem(2, RCF_DOUBLE, 2);
    create();
    writeStatic(4, 10.0f);
    writeStatic(2, 20.0f);
    writeStatic(6, 30.0f);
    writeSteps(6, {1, 2, 3, 4, 5, 6});
    reopen();
    ASSERT_EQ(grdParamModifyTimes(rh(), 0), 0);
    // The dynamic data first: the reader passes over the static items itself.
    expectStep(rh(), 0, 1, 1.0);
    ASSERT_EQ(grdFindItemStatic(rh(), file_, 2), 0);
    EXPECT_EQ(nextStaticFirstValue(), 20.0f);
    ASSERT_EQ(grdFindItemStatic(rh(), file_, 3), 0);
    EXPECT_EQ(nextStaticFirstValue(), 30.0f);
    ASSERT_EQ(grdFindItemStatic(rh(), file_, 1), 0);
    EXPECT_EQ(nextStaticFirstValue(), 10.0f);
    EXPECT_EQ(grdFindItemStatic(rh(), file_, 4), 1002);
    EXPECT_EQ(grdFindItemStatic(rh(), file_, 0), 1002);
    ASSERT_EQ(grdFindBlockStatic(rh(), file_), 0);
    EXPECT_EQ(nextStaticFirstValue(), 10.0f);
    EXPECT_EQ(nextStaticFirstValue(), 20.0f);
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 5), 0);
    expectStep(rh(), 5, 1, 6.0);
    ASSERT_EQ(grdFindItemDynamic(rh(), file_, 2, 2), 0);
    expectStep(rh(), 2, 2, 3.0);
    EXPECT_EQ(takeCodes(), Codes{});
}

// A compressed file starts its static items with the encoding keys; the
// static search passes over them.
TEST_F(Position, StaticSearchPassesOverTheEncodingKeys) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    const int32_t xKey[] = {0, 1, 1};
    const int32_t yKey[] = {0, 0, 1};
    const int32_t zKey[] = {0, 0, 0};
    ASSERT_EQ(grdSetEncodeKey(header_, xKey, yKey, zKey, 3), 0);
    defineItem(1, RCF_FLOAT, 2, 2);
    create();
    writeStatic(3, 7.0f);
    writeSteps(2);
    reopen();
    EXPECT_EQ(nextStaticFirstValue(), 7.0f);
    ASSERT_EQ(grdFindBlockStatic(rh(), file_), 0);
    EXPECT_EQ(nextStaticFirstValue(), 7.0f);
    ASSERT_EQ(grdFindItemStatic(rh(), file_, 1), 0);
    EXPECT_EQ(nextStaticFirstValue(), 7.0f);
    EXPECT_EQ(grdFindItemStatic(rh(), file_, 2), 1002);
    std::vector<float> got(4);
    ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, got.data()), 0);
    EXPECT_EQ(got[1], dyntest::floatValue(0, 1, 1));
    EXPECT_EQ(got[2], F_DELETE_VALUE_FLOAT);
}

TEST_F(Position, SpanOfANonEquidistantAxisIsTheLastTimeLessTheStart) {
    writeFile(6);
    double span = 0;
    ASSERT_EQ(_grdGetTimeAxisSpan(rh(), file_, &span), 0);
    EXPECT_EQ(span, timeOf(5) - timeOf(0));
    // The file is left at its static data, the cursor at the start.
    EXPECT_EQ(rh()->timeStepsDone, 0);
    expectStep(rh(), 0, 1, timeOf(0));
    ASSERT_EQ(grdParamModifyTimes(rh(), 1), 0);
    ASSERT_EQ(_grdGetTimeAxisSpan(rh(), file_, &span), 0);
    EXPECT_EQ(span, timeOf(5) - timeOf(0));
    rh()->timeAxis.time.timeSteps = 0;
    EXPECT_EQ(_grdGetTimeAxisSpan(rh(), file_, &span), 1001);
    EXPECT_EQ(takeCodes(), Codes{});
}

}  // namespace
