// Time axes: setters per file-type family, date and time text rules, the
// getters (calendar getters with and without the modify-times switch), the
// date arithmetic and the span of equidistant axes.
#include <cstdio>
#include <initializer_list>
#include <string>

#include "common/testutil.h"
#include "grd/fileio.h"
#include "test_header_support.h"

namespace {

using grdtest::Codes;
using grdtest::GrdTest;

class TimeAxis : public GrdTest {};

TEST_F(TimeAxis, EquidistantTimeAxisNeedsAPositiveStepOnAnEquidistantFileType) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS);
    EXPECT_EQ(grdSetEqTimeAxis(h, 1400, 10.0, 0.0, 0), 1000);
    EXPECT_EQ(grdSetEqTimeAxis(h, 1400, 10.0, -1.0, 0), 1000);
    EXPECT_EQ(grdGetTimeAxisType(h), 0);
    ASSERT_EQ(grdSetEqTimeAxis(h, 1400, 10.0, 1.5, 3), 0);
    EXPECT_EQ(grdGetTimeAxisType(h), F_TM_EQ_AXIS);
    int32_t unit = 0, steps = -1, first = 0;
    double start = 0, step = 0;
    const char* unitText = nullptr;
    ASSERT_EQ(grdGetEqTimeAxis(h, &unit, &unitText, &start, &step, &steps, &first), 0);
    EXPECT_EQ(unit, 1400);
    const char* expected = nullptr;
    ASSERT_TRUE(qtyGetUnitKey(1400, &expected));
    EXPECT_STREQ(unitText, expected);
    EXPECT_EQ(start, 10.0);
    EXPECT_EQ(step, 1.5);
    EXPECT_EQ(steps, 0);
    EXPECT_EQ(first, 3);
    EXPECT_EQ(grdGetNeqTimeAxis(h, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(grdGetEqCalendarAxis(h, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000, 1000}));

    makeHeader(F_EQTIME_TVARSPACE_ALLITEMS);
    EXPECT_EQ(grdSetEqTimeAxis(header_, 1400, 0, 1, 0), 0);
    for (int32_t fileType : {4, 8, 16}) {
        makeHeader(fileType);
        EXPECT_EQ(grdSetEqTimeAxis(header_, 1400, 0, 1, 0), 1000) << fileType;
        EXPECT_EQ(grdSetEqCalendarAxis(header_, "2020-01-01", "00:00:00", 1400, 0, 1, 0), 1000) << fileType;
    }
    makeHeader(3);
    EXPECT_EQ(grdSetEqTimeAxis(header_, 1400, 0, 0, 0), 2010);  // the file type is tested first
    EXPECT_EQ(grdSetEqTimeAxis(nullptr, 1400, 0, 1, 0), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 1000, 1000, 1000, 1000, 2010, 1000}));
}

TEST_F(TimeAxis, NonEquidistantTimeAxisKeepsOnlyUnitAndFirstIndex) {
    HeaderHandle h = makeHeader(F_NEQTIME_FIXEDSPACE_VARITEMS);
    ASSERT_EQ(grdSetNeqTimeAxis(h, 1400, 123.0, 2), 0);
    EXPECT_EQ(grdGetTimeAxisType(h), F_TM_NEQ_AXIS);
    double start = -1, step = -1;
    int32_t first = 0;
    ASSERT_EQ(grdGetNeqTimeAxis(h, nullptr, nullptr, &start, &step, nullptr, &first), 0);
    EXPECT_EQ(start, 0.0);  // not stored by the setter
    EXPECT_EQ(step, 0.0);
    EXPECT_EQ(first, 2);
    // The stored fields, as the file layer keeps them, are what the getter gives.
    h->timeAxis.time.start = 5;
    h->timeAxis.time.timeSteps = 8;
    int32_t steps = 0;
    grdGetNeqTimeAxis(h, nullptr, nullptr, &start, nullptr, &steps, nullptr);
    EXPECT_EQ(start, 5.0);
    EXPECT_EQ(steps, 8);

    makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS);
    EXPECT_EQ(grdSetNeqTimeAxis(header_, 1400, 0, 0), 1000);
    EXPECT_EQ(grdSetNeqCalendarAxis(header_, "2020-01-01", "00:00:00", 1400, 0, 0), 1000);
    makeHeader(3);
    EXPECT_EQ(grdSetNeqTimeAxis(header_, 1400, 0, 0), 2010);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000, 2010}));
}

TEST_F(TimeAxis, SettersReplaceAStoredUnitText) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS);
    h->timeAxis.type = F_TM_EQ_AXIS;  // as read from an older file: the unit only as text
    h->timeAxis.time.unit = -1;
    const char* secondText = nullptr;
    ASSERT_TRUE(qtyGetUnitKey(1400, &secondText));
    h->timeAxis.time.unitText.assign(secondText);
    int32_t unit = 0;
    const char* text = nullptr;
    ASSERT_EQ(grdGetEqTimeAxis(h, &unit, &text, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_STREQ(text, secondText);
    EXPECT_EQ(unit, 1400);  // looked up from the text
    ASSERT_EQ(grdSetEqTimeAxis(h, 1400, 0, 1, 0), 0);
    EXPECT_TRUE(h->timeAxis.time.unitText.isNull());
}

TEST_F(TimeAxis, DateAndTimeTextRules) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS);
    for (const char* date : std::initializer_list<const char*>{"2024-1-05", "2024/01/05", "2024-01-0x", "2024-01-051", "", nullptr}) {
        EXPECT_EQ(grdSetEqCalendarAxis(h, date, "12:00:00", 1400, 0, 1, 0), 2011) << (date ? date : "null");
    }
    EXPECT_EQ(takeCodes(), Codes(6, 2011));
    for (const char* time : std::initializer_list<const char*>{"12:00", "12-00-00", "12:00:0a", "1:00:00 ", nullptr}) {
        EXPECT_EQ(grdSetEqCalendarAxis(h, "2024-01-05", time, 1400, 0, 1, 0), 2012) << (time ? time : "null");
    }
    EXPECT_EQ(takeCodes(), Codes(5, 2012));
    // The type is set before the texts are tested; a time failure keeps the new date.
    EXPECT_EQ(h->timeAxis.type, F_CAL_EQ_AXIS);
    EXPECT_STREQ(h->timeAxis.startDate, "2024-01-05");
    // Values are not range-checked.
    EXPECT_EQ(grdSetEqCalendarAxis(h, "2024-13-45", "99:99:99", 1400, 0, 1, 0), 0);

    testing::internal::CaptureStdout();
    grdDebugOn(1);
    grdSetEqCalendarAxis(h, "2024-01-0x", "00:00:00", 1400, 0, 1, 0);
    grdSetEqCalendarAxis(h, "2024-01-01", "00:00", 1400, 0, 1, 0);
    grdSetEqCalendarAxis(h, "2024-01-01", "00:00:00", 1400, 0, 1, 0);
    grdDebugOn(0);
    const std::string out = testing::internal::GetCapturedStdout();
    EXPECT_NE(out.find("F_ERR_DATE_FORMAT 2011"), std::string::npos) << out;
    EXPECT_NE(out.find("F_ERR_TIME_FORMAT 2012"), std::string::npos) << out;
    EXPECT_NE(out.find("F_NO_ERROR = OK"), std::string::npos) << out;
    takeCodes();
}

TEST_F(TimeAxis, CalendarAxesRoundTrip) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS);
    ASSERT_EQ(grdSetEqCalendarAxis(h, "2020-01-01", "00:00:00", 1400, 0.0, 60.0, 4), 0);
    int32_t unit = 0, steps = -1, first = 0;
    const char *date = nullptr, *time = nullptr;
    double offset = -1, step = 0;
    ASSERT_EQ(grdGetEqCalendarAxis(h, &unit, nullptr, &date, &time, &offset, &step, &steps, &first), 0);
    EXPECT_EQ(unit, 1400);
    EXPECT_STREQ(date, "2020-01-01");
    EXPECT_STREQ(time, "00:00:00");
    EXPECT_EQ(offset, 0.0);
    EXPECT_EQ(step, 60.0);
    EXPECT_EQ(steps, 0);
    EXPECT_EQ(first, 4);
    EXPECT_EQ(grdGetNeqCalendarAxis(h, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(grdGetEqTimeAxis(h, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000}));

    makeHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS);
    ASSERT_EQ(grdSetNeqCalendarAxis(header_, "1999-12-31", "23:59:59", 1400, 500.0, 1), 0);
    EXPECT_EQ(grdGetTimeAxisType(header_), F_CAL_NEQ_AXIS);
    ASSERT_EQ(grdGetNeqCalendarAxis(header_, nullptr, nullptr, &date, &time, &offset, &step, nullptr, &first), 0);
    EXPECT_STREQ(date, "1999-12-31");  // the offset is not stored by this setter
    EXPECT_STREQ(time, "23:59:59");
    EXPECT_EQ(offset, 0.0);
    EXPECT_EQ(step, 0.0);
    EXPECT_EQ(first, 1);
}

TEST_F(TimeAxis, CalendarGettersApplyTheOffsetOnlyWithModifyTimes) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS);
    const int32_t hour = grdtest::unitOfSeconds(3600.0);
    ASSERT_NE(hour, 0);
    ASSERT_EQ(grdSetEqCalendarAxis(h, "2021-01-31", "22:30:00", hour, 2.5, 1.0, 0), 0);
    const char *date = nullptr, *time = nullptr;
    double offset = -1;
    ASSERT_EQ(grdGetEqCalendarAxis(h, nullptr, nullptr, &date, &time, &offset, nullptr, nullptr, nullptr), 0);
    EXPECT_STREQ(date, "2021-02-01");
    EXPECT_STREQ(time, "01:00:00");
    EXPECT_EQ(offset, 0.0);
    // The stored start is untouched; the given-out texts are the header's own.
    EXPECT_STREQ(h->timeAxis.startDate, "2021-01-31");
    EXPECT_EQ(date, h->timeAxis.outDate);

    ASSERT_EQ(grdParamModifyTimes(h, 0), 0);
    ASSERT_EQ(grdGetEqCalendarAxis(h, nullptr, nullptr, &date, &time, &offset, nullptr, nullptr, nullptr), 0);
    EXPECT_STREQ(date, "2021-01-31");
    EXPECT_STREQ(time, "22:30:00");
    EXPECT_EQ(offset, 2.5);

    // Negative offsets go back across the year boundary.
    grdParamModifyTimes(h, 1);
    ASSERT_EQ(grdSetEqCalendarAxis(h, "2000-01-01", "00:00:10", QTY_UNIT_SECOND, -20.0, 1.0, 0), 0);
    grdGetEqCalendarAxis(h, nullptr, nullptr, &date, &time, nullptr, nullptr, nullptr, nullptr);
    EXPECT_STREQ(date, "1999-12-31");
    EXPECT_STREQ(time, "23:59:50");
    // An offset the unit library cannot turn into seconds leaves the texts.
    ASSERT_EQ(grdSetEqCalendarAxis(h, "2000-01-01", "00:00:10", grdtest::unitOf(QTY_ITEM_GEOMETRY_1D, 1), 5.0, 1.0,
                                   0),
              0);
    grdGetEqCalendarAxis(h, nullptr, nullptr, &date, &time, &offset, nullptr, nullptr, nullptr);
    EXPECT_STREQ(date, "2000-01-01");
    EXPECT_STREQ(time, "00:00:10");
    EXPECT_EQ(offset, 0.0);
    EXPECT_TRUE(takeCodes().empty());
}

TEST_F(TimeAxis, DateArithmeticIsProlepticGregorian) {
    auto add = [](GrdDateTime t, int64_t seconds) {
        const GrdDateTime r = grdSecondsToDateTime(grdDateTimeToSeconds(t) + seconds);
        char text[40];
        std::snprintf(text, sizeof text, "%d-%02d-%02d %02d:%02d:%02d", r.year, r.month, r.day, r.hour, r.minute,
                      r.second);
        return std::string(text);
    };
    const int64_t day = 86400;
    EXPECT_EQ(grdDateTimeToSeconds({1970, 1, 1, 0, 0, 0}), 0);
    EXPECT_EQ(grdDateTimeToSeconds({2000, 3, 1, 0, 0, 0}), 951868800);
    EXPECT_EQ(add({1900, 2, 28, 12, 0, 0}, day), "1900-03-01 12:00:00");  // 1900 is not a leap year
    EXPECT_EQ(add({2000, 2, 28, 12, 0, 0}, day), "2000-02-29 12:00:00");  // 2000 is
    EXPECT_EQ(add({2024, 2, 28, 0, 0, 0}, 2 * day), "2024-03-01 00:00:00");
    EXPECT_EQ(add({2023, 12, 31, 23, 59, 59}, 1), "2024-01-01 00:00:00");
    EXPECT_EQ(add({2024, 3, 1, 0, 0, 0}, -1), "2024-02-29 23:59:59");
    EXPECT_EQ(add({1900, 3, 1, 0, 0, 0}, -day), "1900-02-28 00:00:00");
    EXPECT_EQ(add({1, 1, 1, 0, 0, 0}, -1), "0-12-31 23:59:59");
    EXPECT_EQ(add({2020, 1, 1, 0, 0, 0}, 400LL * 365 * day + 97 * day), "2420-01-01 00:00:00");
    // Fields out of range carry over, as texts passing the rules may hold them.
    EXPECT_EQ(add({2024, 13, 45, 0, 0, 0}, 0), "2025-02-14 00:00:00");
    EXPECT_EQ(add({2024, 1, 1, 99, 99, 99}, 0), "2024-01-05 04:40:39");
}

TEST_F(TimeAxis, SpanOfEquidistantAxesCountsOneStepPastTheLast) {
    HeaderHandle h = makeHeader(F_EQTIME_FIXEDSPACE_ALLITEMS);
    // A file of no header: the equidistant kinds never read it.
    testutil::TempDir dir;
    FileHandle file = FOpenFileCreate(dir.file("span.grd").c_str(), 0);
    ASSERT_NE(file, nullptr);
    double span = 0;
    EXPECT_EQ(_grdGetTimeAxisSpan(h, file, &span), 0);  // no time axis
    EXPECT_EQ(span, F_DELETE_VALUE_DOUBLE);
    ASSERT_EQ(grdSetEqTimeAxis(h, 1400, 100, 60, 0), 0);
    h->timeAxis.time.timeSteps = 10;
    EXPECT_EQ(_grdGetTimeAxisSpan(h, file, &span), 0);
    EXPECT_EQ(span, 600.0);
    ASSERT_EQ(grdSetEqCalendarAxis(h, "2020-01-01", "00:00:00", 1400, 0, 30, 0), 0);
    h->timeAxis.calendar.timeSteps = 4;
    EXPECT_EQ(_grdGetTimeAxisSpan(h, file, &span), 0);
    EXPECT_EQ(span, 120.0);
    EXPECT_EQ(_grdGetTimeAxisSpan(h, nullptr, &span), 1000);
    EXPECT_EQ(span, F_DELETE_VALUE_DOUBLE);
    EXPECT_EQ(_grdGetTimeAxisSpan(nullptr, file, &span), 1000);
    EXPECT_EQ(takeCodes(), (Codes{1000, 1000}));
    FCloseFile(&file);
}

}  // namespace
