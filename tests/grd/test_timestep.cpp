// Dynamic time-step data: round trips of equidistant and non-equidistant
// files (values and times), skips, compression by the encoding keys, unit
// conversion on write and read, rounding to significant digits, the cursor
// checks, and damaged records.
#include <algorithm>
#include <cmath>
#include <cstring>
#include <vector>

#include "test_dynamic_support.h"

namespace {

using dyntest::Codes;
using dyntest::DynamicTest;

class TimeStep : public DynamicTest {};

TEST_F(TimeStep, EquidistantFileGivesBackValuesAndStepIndicesAsTimes) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 3, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 60.0, 0), 0);
    defineItem(1, RCF_FLOAT, 3, 2);
    defineItem(2, RCF_DOUBLE, 4);
    defineItem(3, RCF_INT4, 0);
    create();
    writeSteps(2);
    // Item 1 of the third step: the step is not complete, the count stays.
    std::vector<unsigned char> first = values(header_, 2, 1);
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, first.data()), 0);
    EXPECT_EQ(header_->timeAxis.time.timeSteps, 2);
    for (int32_t i = 2; i <= 3; ++i) {
        std::vector<unsigned char> data = values(header_, 2, i);
        ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, data.data()), 0);
    }
    EXPECT_EQ(header_->timeAxis.time.timeSteps, 3);

    reopen();
    int32_t steps = 0;
    ASSERT_EQ(grdGetEqTimeAxis(rh(), nullptr, nullptr, nullptr, nullptr, &steps, nullptr), 0);
    EXPECT_EQ(steps, 3);
    for (int32_t s = 0; s < 3; ++s)
        for (int32_t i = 1; i <= 3; ++i) expectStep(rh(), s, i, s);
    // Past the last time step: the end of the file, reported to no handler.
    double time = 0;
    std::vector<unsigned char> buffer(64);
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, &time, buffer.data()), 1);
    EXPECT_EQ(time, F_DELETE_VALUE_DOUBLE);
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(TimeStep, EquidistantFileStoresOneEmptyTimeStepBlockPerStep) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 2);
    defineItem(2, RCF_FLOAT, 2);
    create();
    writeSteps(4);
    closeFile();
    const std::vector<uint8_t> bytes = testutil::readBytes(path());
    // 50001 = 0xC351: block start, identifier, and at once the terminator.
    const std::vector<uint8_t> emptyStep = {0xFE, 0x51, 0xC3, 0xFF, 0x01, 0x02, 0x00, 0x00, 0x00};
    int found = 0;
    for (size_t at = dyntest::find(bytes, emptyStep); at != std::string::npos;
         at = dyntest::find(bytes, emptyStep, at + 1))
        ++found;
    EXPECT_EQ(found, 4);
    EXPECT_NE(dyntest::find(bytes, {0xFE, 0x50, 0xC3, 0xFF}), std::string::npos);  // 50000, once
}

TEST_F(TimeStep, NonEquidistantFileStoresTheFirstItemsTimeAndTakesItsStart) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 2, 1);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_DOUBLE, 5);
    defineItem(2, RCF_FLOAT, 2, 2);
    create();
    const std::vector<double> times = {100.0, 105.5, 130.0, 112.25};
    writeSteps(4, times);
    EXPECT_EQ(header_->timeAxis.time.start, 100.0);
    EXPECT_EQ(header_->largestTime, 130.0);

    reopen();
    double start = 0;
    int32_t steps = 0;
    ASSERT_EQ(grdGetNeqTimeAxis(rh(), nullptr, nullptr, &start, nullptr, &steps, nullptr), 0);
    EXPECT_EQ(start, 100.0);
    EXPECT_EQ(steps, 4);
    ASSERT_EQ(grdParamModifyTimes(rh(), 0), 0);
    for (int32_t s = 0; s < 4; ++s)
        for (int32_t i = 1; i <= 2; ++i) expectStep(rh(), s, i, times[s]);
    // With the modify-times switch on, times are relative to the start.
    ASSERT_EQ(grdFindBlockDynamic(rh(), file_), 0);
    ASSERT_EQ(grdParamModifyTimes(rh(), 1), 0);
    for (int32_t s = 0; s < 4; ++s) {
        double time = 0;
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, &time, nullptr), 0);
        EXPECT_EQ(time, times[s] - 100.0);
        ASSERT_EQ(grdSkipItem(rh(), file_), 0);
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(TimeStep, CalendarAxesFollowTheirTimeFamily) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetEqCalendarAxis(header_, "2020-01-01", "06:00:00", 1400, 0.0, 3600.0, 0), 0);
    defineItem(1, RCF_FLOAT, 3);
    create();
    writeSteps(3, {7.0, 8.0, 9.0});
    reopen();
    for (int32_t s = 0; s < 3; ++s) expectStep(rh(), s, 1, s);
    int32_t steps = 0;
    ASSERT_EQ(grdGetEqCalendarAxis(rh(), nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, &steps, nullptr), 0);
    EXPECT_EQ(steps, 3);

    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetNeqCalendarAxis(header_, "2020-01-01", "06:00:00", 1400, 0.0, 0), 0);
    defineItem(1, RCF_DOUBLE, 2);
    create();
    writeSteps(3, {600.0, 660.0, 900.0});
    EXPECT_EQ(header_->timeAxis.calendar.start, 600.0);
    reopen();
    EXPECT_EQ(rh()->timeAxis.calendar.start, 600.0);
    ASSERT_EQ(grdParamModifyTimes(rh(), 0), 0);
    for (int32_t s = 0; s < 3; ++s) expectStep(rh(), s, 1, std::vector<double>{600.0, 660.0, 900.0}[s]);
    ASSERT_EQ(grdFindBlockDynamic(rh(), file_), 0);
    ASSERT_EQ(grdParamModifyTimes(rh(), 1), 0);
    for (double relative : {0.0, 60.0, 300.0}) {
        double time = -1;
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, &time, nullptr), 0);
        EXPECT_EQ(time, relative);
    }
}

TEST_F(TimeStep, AppendedTimeStepsFollowTheWrittenOnes) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 2, 2);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_FLOAT, 2, 2);
    defineItem(2, RCF_DOUBLE, 3);
    create();
    writeStatic(5, 1.0f);
    writeSteps(3, {50.0, 60.0, 70.0});
    closeFile();

    HeaderHandle appended = nullptr;
    ASSERT_EQ(grdFileAppend(path().c_str(), &appended, &file_), 0);
    EXPECT_EQ(appended->timeStepsDone, 3);
    // Steps 3 and 4 carry the values writeSteps gives steps 3 and 4.
    for (int32_t s = 3; s < 5; ++s)
        for (int32_t i = 1; i <= 2; ++i) {
            std::vector<unsigned char> data = values(appended, s, i);
            ASSERT_EQ(grdWriteItemTimeStep(appended, file_, 50.0 + 10 * s, data.data()), 0);
        }
    EXPECT_EQ(appended->timeAxis.time.start, 50.0);  // the start stays that of the first step
    ASSERT_EQ(grdFileClose(appended, &file_), 0);
    grdHeaderDestroy(&appended);

    reopen();
    ASSERT_EQ(grdParamModifyTimes(rh(), 0), 0);
    int32_t steps = 0;
    ASSERT_EQ(grdGetNeqTimeAxis(rh(), nullptr, nullptr, nullptr, nullptr, &steps, nullptr), 0);
    EXPECT_EQ(steps, 5);
    for (int32_t s = 0; s < 5; ++s)
        for (int32_t i = 1; i <= 2; ++i) expectStep(rh(), s, i, 50.0 + 10 * s);
    double span = 0;
    ASSERT_EQ(_grdGetTimeAxisSpan(rh(), file_, &span), 0);
    EXPECT_EQ(span, 40.0);
    EXPECT_EQ(nextStaticFirstValue(), 1.0f);  // the span leaves the file at the static items
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(TimeStep, SkipsMoveTheCursorAndReadTheTimeOfANewStep) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 3, 1);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_FLOAT, 4, 3);
    defineItem(2, RCF_DOUBLE, 7);
    defineItem(3, RCF_FLOAT, 0);
    create();
    writeSteps(4, {10.0, 20.0, 30.0, 40.0});
    reopen();
    ASSERT_EQ(grdParamModifyTimes(rh(), 0), 0);

    ASSERT_EQ(grdSkipItem(rh(), file_), 0);  // item 1 of step 0: the step's time is read
    EXPECT_EQ(rh()->currentTime, 10.0);
    EXPECT_EQ(rh()->nextItem, 1);
    expectStep(rh(), 0, 2, 10.0);
    ASSERT_EQ(grdSkipTimeStep(rh(), file_), 0);  // finishes step 0
    EXPECT_EQ(rh()->timeStepsDone, 1);
    EXPECT_EQ(rh()->nextItem, 0);
    expectStep(rh(), 1, 1, 20.0);
    double time = 0;
    ASSERT_EQ(grdReadItemTimeStep(rh(), file_, &time, nullptr), 0);  // no buffer: item 2 skipped
    EXPECT_EQ(time, 20.0);
    ASSERT_EQ(grdSkipTimeStep(rh(), file_), 0);
    ASSERT_EQ(grdSkipTimeStep(rh(), file_), 0);
    EXPECT_EQ(rh()->timeStepsDone, 3);
    EXPECT_EQ(rh()->currentTime, 30.0);
    expectStep(rh(), 3, 1, 40.0);
    expectStep(rh(), 3, 2, 40.0);
    expectStep(rh(), 3, 3, 40.0);
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(TimeStep, CompressedItemsStoreOnlyTheKeysElements) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 4, 3);
    defineItem(2, RCF_DOUBLE, 4, 3);
    // Grid positions y * 4 + x: 0, 3, 5, 10, 8.
    const int32_t xKey[] = {0, 3, 1, 2, 0};
    const int32_t yKey[] = {0, 0, 1, 2, 2};
    const int64_t positions[] = {0, 3, 5, 10, 8};
    ASSERT_EQ(grdSetEncodeKey(header_, xKey, yKey, nullptr, 5), 0);
    create();
    writeSteps(2);  // full 4 x 3 arrays, gathered on write
    closeFile();
    const std::vector<uint8_t> bytes = testutil::readBytes(path());
    EXPECT_NE(dyntest::find(bytes, {0xFE, 0x51, 0xC3, 0xFF, 0x01, 0x05, 0x00, 0x00, 0x00}), std::string::npos);

    reopen();
    ASSERT_EQ(grdGetEncodeKeySize(rh()), 5);
    for (int32_t s = 0; s < 2; ++s) {
        std::vector<float> f(12 + 4, 7.0f);
        std::vector<double> d(12 + 4, 7.0);
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, f.data()), 0);
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, d.data()), 0);
        for (int64_t e = 0; e < 12; ++e) {
            const bool stored = std::find(std::begin(positions), std::end(positions), e) != std::end(positions);
            EXPECT_EQ(f[e], stored ? dyntest::floatValue(s, 1, e) : F_DELETE_VALUE_FLOAT) << e;
            EXPECT_EQ(d[e], stored ? dyntest::doubleValue(s, 2, e) : F_DELETE_VALUE_DOUBLE) << e;
        }
        for (size_t e = 12; e < f.size(); ++e) EXPECT_EQ(f[e], 7.0f);
    }

    // With compression enabled the caller handles the key's elements only.
    grdItemEnableCompression(rh());
    ASSERT_EQ(grdFindBlockDynamic(rh(), file_), 0);
    std::vector<float> packed(5 + 2, 7.0f);
    ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, packed.data()), 0);
    for (int k = 0; k < 5; ++k) EXPECT_EQ(packed[k], dyntest::floatValue(0, 1, positions[k]));
    EXPECT_EQ(packed[5], 7.0f);

    // A key that points outside the grid is refused, never followed.
    rh()->keyX[2] = 1000;
    std::vector<double> d(12 + 4, 7.0);
    grdFindBlockDynamic(rh(), file_);
    rh()->itemCompressionEnabled = 0;
    ASSERT_EQ(grdSkipItem(rh(), file_), 0);
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, d.data()), 2010);
    for (size_t e = 12; e < d.size(); ++e) EXPECT_EQ(d[e], 7.0);
    EXPECT_EQ(takeCodes(), Codes{2010});
}

TEST_F(TimeStep, ACompressedRecordCutShortIsRefusedBeforeAnythingIsRead) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_DOUBLE, 10, 10);
    std::vector<int32_t> xKey(60), yKey(60);
    for (int32_t k = 0; k < 60; ++k) {
        xKey[k] = k % 10;
        yKey[k] = k / 10;
    }
    ASSERT_EQ(grdSetEncodeKey(header_, xKey.data(), yKey.data(), nullptr, 60), 0);
    create();
    writeSteps(2);
    closeFile();
    std::vector<uint8_t> bytes = testutil::readBytes(path());
    bytes.resize(bytes.size() - 8);
    testutil::writeBytes(path(), bytes);
    reopen();
    std::vector<double> got(100 + 4, 7.0);
    ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, got.data()), 0);
    EXPECT_EQ(got[59], dyntest::doubleValue(0, 1, 59));
    std::fill(got.begin(), got.end(), 7.0);
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, got.data()), 2001);
    for (double v : got) EXPECT_EQ(v, 7.0);
    EXPECT_EQ(takeCodes(), Codes{2001});
}

TEST_F(TimeStep, CompressedWriteOfKeyOrderedValuesOnceCompressionIsEnabled) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_FLOAT, 3, 3);
    const int32_t xKey[] = {2, 0, 1};
    const int32_t yKey[] = {0, 1, 2};
    ASSERT_EQ(grdSetEncodeKey(header_, xKey, yKey, nullptr, 3), 0);
    grdItemEnableCompression(header_);
    create();
    const float keyOrdered[] = {1.5f, 2.5f, 3.5f};
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 5.0, keyOrdered), 0);
    // A key outside the grid fails the write before anything is written.
    header_->itemCompressionEnabled = 0;
    header_->keyY[1] = -7;
    const std::vector<float> full(9, 1.0f);
    EXPECT_EQ(grdWriteItemTimeStep(header_, file_, 6.0, full.data()), 2010);
    EXPECT_EQ(header_->timeStepsDone, 1);
    header_->keyY[1] = 1;
    reopen();
    std::vector<float> got(9, 0.0f);
    ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, got.data()), 0);
    EXPECT_EQ(got[2], 1.5f);
    EXPECT_EQ(got[3], 2.5f);
    EXPECT_EQ(got[7], 3.5f);
    EXPECT_EQ(got[0], F_DELETE_VALUE_FLOAT);
    EXPECT_EQ(takeCodes(), Codes{2010});
}

// Unit conversion: WaterLevel stored in centimetres; the caller works in the
// user unit (mode 1), in feet (mode 2) or in the quantity's first unit (3).
TEST_F(TimeStep, ConversionModesConvertCopiesOnWriteAndTheBufferOnRead) {
    using dyntest::kCentimetre;
    using dyntest::kFoot;
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    ItemHandle f = defineItem(1, RCF_FLOAT, 3, 0, dyntest::kWaterLevel, kCentimetre);
    ItemHandle d = defineItem(2, RCF_DOUBLE, 3, 0, dyntest::kWaterLevel, kCentimetre);
    int32_t userUnit = 0;
    ASSERT_NE(qtyGetUserUnit(dyntest::kWaterLevel, &userUnit), 0);
    const int32_t baseUnit = grdtest::unitOf(dyntest::kWaterLevel, 1);
    const int32_t callerUnit[4] = {kCentimetre, userUnit, kFoot, baseUnit};
    ASSERT_NE(userUnit, kCentimetre);
    ASSERT_NE(baseUnit, kCentimetre);

    const float delF = F_DELETE_VALUE_FLOAT;
    const double delD = F_DELETE_VALUE_DOUBLE;
    create();
    for (int32_t mode = 1; mode <= 3; ++mode) {
        ASSERT_EQ(grdSetItemUnitConversion(f, mode, kFoot), 0);
        ASSERT_EQ(grdSetItemUnitConversion(d, mode, kFoot), 0);
        const float fv[3] = {1.5f, delF, -2.25f};
        const double dv[3] = {0.125, 3.75, delD};
        ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, fv), 0);
        ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, dv), 0);
        EXPECT_EQ(fv[0], 1.5f);  // the caller's arrays are never changed
        EXPECT_EQ(dv[1], 3.75);
    }

    reopen();
    // Stored values, read without conversion (the mode is not part of the file).
    ASSERT_EQ(grdSetItemUnitConversion(grdItemD(rh(), 1), 0, 0), 0);
    ASSERT_EQ(grdSetItemUnitConversion(grdItemD(rh(), 2), 0, 0), 0);
    for (int32_t mode = 1; mode <= 3; ++mode) {
        float fv[3];
        double dv[3];
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, fv), 0);
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, dv), 0);
        const int32_t from = callerUnit[mode];
        EXPECT_FLOAT_EQ(fv[0], static_cast<float>(grdtest::convert(from, 1.5, kCentimetre))) << mode;
        EXPECT_EQ(fv[1], delF);
        EXPECT_FLOAT_EQ(fv[2], static_cast<float>(grdtest::convert(from, -2.25, kCentimetre))) << mode;
        EXPECT_DOUBLE_EQ(dv[0], grdtest::convert(from, 0.125, kCentimetre)) << mode;
        EXPECT_DOUBLE_EQ(dv[1], grdtest::convert(from, 3.75, kCentimetre)) << mode;
        EXPECT_EQ(dv[2], delD);
    }
    // Read in each mode: the values come back in the caller's unit.
    ASSERT_EQ(grdFindBlockDynamic(rh(), file_), 0);
    for (int32_t mode = 1; mode <= 3; ++mode) {
        ASSERT_EQ(grdSetItemUnitConversion(grdItemD(rh(), 1), mode, kFoot), 0);
        ASSERT_EQ(grdSetItemUnitConversion(grdItemD(rh(), 2), mode, kFoot), 0);
        float fv[3];
        double dv[3];
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, fv), 0);
        ASSERT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, dv), 0);
        EXPECT_NEAR(fv[0], 1.5f, 1e-5) << mode;
        EXPECT_EQ(fv[1], delF);
        EXPECT_NEAR(fv[2], -2.25f, 1e-5) << mode;
        EXPECT_DOUBLE_EQ(dv[0], 0.125) << mode;
        EXPECT_DOUBLE_EQ(dv[1], 3.75) << mode;
        EXPECT_EQ(dv[2], delD);
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(TimeStep, TruncationRoundsToSignificantDigitsAndLeavesDeleteValues) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 3, 1);
    defineItem(1, RCF_FLOAT, 7);
    defineItem(2, RCF_DOUBLE, 7);
    defineItem(3, RCF_INT4, 2);
    float f[7] = {123456.0f, 0.012345f, 456.7f, F_DELETE_VALUE_FLOAT, 0.0f, -456.7f, 99.96f};
    double d[7] = {123456.0, 0.012345, 456.7, F_DELETE_VALUE_DOUBLE, 0.0, -0.00098765, 1.234e-300};
    EXPECT_EQ(grdTruncateItemTimeStep(header_, 1, 3, f), 0);
    EXPECT_EQ(grdTruncateItemTimeStep(header_, 2, 3, d), 0);
    EXPECT_EQ(f[0], 123000.0f);
    EXPECT_EQ(f[1], 0.0123f);
    EXPECT_EQ(f[2], 457.0f);
    EXPECT_EQ(f[3], F_DELETE_VALUE_FLOAT);
    EXPECT_EQ(f[4], 0.0f);
    EXPECT_EQ(f[5], -457.0f);
    EXPECT_EQ(f[6], 100.0f);
    EXPECT_EQ(d[0], 123000.0);
    EXPECT_DOUBLE_EQ(d[1], 0.0123);
    EXPECT_EQ(d[2], 457.0);
    EXPECT_EQ(d[3], F_DELETE_VALUE_DOUBLE);
    EXPECT_EQ(d[4], 0.0);
    EXPECT_DOUBLE_EQ(d[5], -0.000988);
    EXPECT_NEAR(d[6] / 1.23e-300, 1.0, 1e-12);
    // Other data types, unknown items and null arrays: nothing changes.
    int32_t ints[2] = {123456, 7};
    EXPECT_EQ(grdTruncateItemTimeStep(header_, 3, 1, ints), 0);
    EXPECT_EQ(ints[0], 123456);
    EXPECT_EQ(grdTruncateItemTimeStep(header_, 4, 3, f), 0);
    EXPECT_EQ(grdTruncateItemTimeStep(nullptr, 1, 3, f), 0);
    EXPECT_EQ(grdTruncateItemTimeStep(header_, 1, 3, nullptr), 0);
    EXPECT_EQ(takeCodes(), Codes{});
}

TEST_F(TimeStep, CursorChecksRefuseWithoutMovingTheCursor) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 2);
    defineItem(2, RCF_FLOAT, 2);
    create();
    const float v[2] = {1, 2};
    EXPECT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, nullptr), 1000);
    EXPECT_EQ(grdWriteItemTimeStep(nullptr, file_, 0.0, v), 1000);
    EXPECT_EQ(grdWriteItemTimeStep(header_, nullptr, 0.0, v), 1000);
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, v), 0);
    header_->items[1].axisType = F_UNDEFINED_AXIS;  // no elements
    EXPECT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, v), 2010);
    // One record holds at most 2^32 - 1 bytes: 2^30 floats (2^32 bytes) and
    // 2^32 bytes are refused before the (two-value) array is touched.
    header_->items[1].axisType = F_EQ_AXIS_D2;
    header_->items[1].size[0] = 32768;
    header_->items[1].size[1] = 32768;
    EXPECT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, v), 2010);
    header_->items[1].dataType = RCF_BYTE;
    header_->items[1].size[0] = 65536;
    header_->items[1].size[1] = 65536;
    EXPECT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, v), 2010);
    header_->items[1].dataType = RCF_FLOAT;
    header_->items[1].size[0] = 2;
    header_->items[1].size[1] = 0;
    header_->items[1].axisType = F_EQ_AXIS_D1;
    EXPECT_EQ(header_->nextItem, 1);
    header_->nextItem = 5;
    EXPECT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, v), 2007);
    EXPECT_EQ(grdSkipItem(header_, file_), 2007);
    header_->nextItem = 1;
    header_->fileType = F_EQTIME_TVARSPACE_ALLITEMS;  // neither written nor read by this library
    EXPECT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, v), 2018);
    EXPECT_EQ(grdReadItemTimeStep(header_, file_, nullptr, nullptr), 2018);
    EXPECT_EQ(grdWriteStartBlockDynamic(header_, file_), 2018);
    header_->fileType = F_NEQTIME_FIXEDSPACE_VARITEMS;
    EXPECT_EQ(grdSkipTimeStep(header_, file_), 2018);
    header_->fileType = F_EQTIME_FIXEDSPACE_ALLITEMS;
    EXPECT_EQ(header_->nextItem, 1);
    EXPECT_EQ(header_->timeStepsDone, 0);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000, 2010, 2010, 2010, 2007, 2007, 2018, 2018, 2018, 2018}));
    ASSERT_EQ(grdWriteItemTimeStep(header_, file_, 0.0, v), 0);
    EXPECT_EQ(header_->timeStepsDone, 1);

    reopen();
    EXPECT_EQ(grdWriteItemTimeStep(rh(), file_, 0.0, v), 2015);
    EXPECT_EQ(grdWriteStartBlockDynamic(rh(), file_), 2015);
    EXPECT_EQ(takeCodes(), (Codes{2015, 2015}));
}

TEST_F(TimeStep, StartBlockIsWrittenOnceAndRaisesTheStepCount) {
    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetNeqTimeAxis(header_, 1400, 0.0, 0), 0);
    defineItem(1, RCF_DOUBLE, 0);
    create();
    ASSERT_EQ(grdWriteStartBlockDynamic(header_, file_), 0);
    ASSERT_EQ(grdWriteStartBlockDynamic(header_, file_), 0);
    writeSteps(2, {1.0, 2.0});
    header_->timeAxis.time.timeSteps = 0;
    ASSERT_EQ(grdWriteStartBlockDynamic(header_, file_), 0);
    EXPECT_EQ(header_->timeAxis.time.timeSteps, 2);
    closeFile();
    const std::vector<uint8_t> bytes = testutil::readBytes(path());
    const size_t first = dyntest::find(bytes, {0xFE, 0x50, 0xC3, 0xFF});
    ASSERT_NE(first, std::string::npos);
    EXPECT_EQ(dyntest::find(bytes, {0xFE, 0x50, 0xC3, 0xFF}, first + 1), std::string::npos);
}

// The count of a record is checked against the item before anything is
// read into the caller's buffer.
TEST_F(TimeStep, DamagedRecordCountsNeverReachTheCallersBuffer) {
    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, 1);
    ASSERT_EQ(grdSetEqTimeAxis(header_, 1400, 0.0, 1.0, 0), 0);
    defineItem(1, RCF_FLOAT, 4);
    create();
    writeSteps(3);
    closeFile();
    std::vector<uint8_t> bytes = testutil::readBytes(path());
    const std::vector<uint8_t> step = {0xFE, 0x51, 0xC3, 0xFF, 0x01, 0x04, 0x00, 0x00, 0x00};
    const size_t at = dyntest::find(bytes, step);
    ASSERT_NE(at, std::string::npos);
    const size_t second = dyntest::find(bytes, step, at + 1);
    ASSERT_NE(second, std::string::npos);
    bytes[at + 5] = 0x40;                 // 64 elements claimed
    bytes[second + 5] = 0x03;             // 3 elements: too few
    bytes.resize(bytes.size() - 6);       // and the last record cut short
    testutil::writeBytes(path(), bytes);

    reopen();
    std::vector<float> buffer(4 + 8, 7.0f);
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, buffer.data()), 2013);
    EXPECT_EQ(rh()->nextItem, 0);
    for (float v : buffer) EXPECT_EQ(v, 7.0f);
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 1), 0);
    EXPECT_EQ(grdReadItemTimeStep(rh(), file_, nullptr, buffer.data()), 2013);
    for (float v : buffer) EXPECT_EQ(v, 7.0f);
    ASSERT_EQ(grdFindTimeStep(rh(), file_, 2), 0);
    EXPECT_NE(grdReadItemTimeStep(rh(), file_, nullptr, buffer.data()), 0);
    for (size_t k = 4; k < buffer.size(); ++k) EXPECT_EQ(buffer[k], 7.0f);
    EXPECT_EQ(rh()->timeStepsDone, 2);
}

TEST_F(TimeStep, PlaceholdersReturnOneAndDoNothing) {
    makeHeader();
    double time = 5;
    int32_t n = 3;
    float data[2] = {1, 2};
    EXPECT_EQ(grdWriteItemTvarTimeStep(header_, nullptr, 0.0, data, data), 1);
    EXPECT_EQ(grdReadItemTvarTimeStep(header_, nullptr, &time, data, data), 1);
    EXPECT_EQ(grdQueryFreeItemTimeStep(header_, nullptr, &n, &n), 1);
    EXPECT_EQ(grdQueryFreeItemTvarTimeStep(header_, nullptr, &n, &n), 1);
    EXPECT_EQ(grdReadFreeItemTimeStep(header_, nullptr, &time, &n, data), 1);
    EXPECT_EQ(grdReadFreeItemTvarTimeStep(header_, nullptr, &time, &n, data, data), 1);
    EXPECT_EQ(grdWriteFreeItemTimeStep(header_, nullptr, 0.0, 1, 2, data), 1);
    EXPECT_EQ(grdWriteFreeItemTvarTimeStep(header_, nullptr, 0.0, 1, 2, data, data), 1);
    EXPECT_EQ(time, 5);
    EXPECT_EQ(n, 3);
    EXPECT_EQ(data[1], 2);
    EXPECT_EQ(header_->nextItem, 0);
    EXPECT_EQ(takeCodes(), Codes{});
}

}  // namespace
