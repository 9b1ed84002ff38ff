// Gridded data-file layer, module grdtimeaxis: the header's time axis (plain
// time values or calendar, equidistant or not), the date and time text rules,
// the calendar getters' date arithmetic and the span of a file's time steps.
#include <cmath>
#include <cstdio>
#include <cstring>

#include "grd/grdheader.h"
#include "grd/grdio.h"
#include "qty/qty.h"

namespace {

constexpr const char* kModule = kModGrdTimeAxis;
constexpr int64_t kSecondsPerDay = 86400;

int64_t floorDiv(int64_t a, int64_t b) { return a / b - ((a % b != 0) && ((a < 0) != (b < 0))); }

// Days since 1970-01-01 of a valid proleptic Gregorian date (month 1-12).
int64_t daysFromCivil(int64_t y, int64_t m, int64_t d) {
    y -= m <= 2;
    const int64_t era = floorDiv(y, 400);
    const int64_t yoe = y - era * 400;
    const int64_t doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;
    const int64_t doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
    return era * 146097 + doe - 719468;
}

void civilFromDays(int64_t z, int64_t& y, int32_t& m, int32_t& d) {
    z += 719468;
    const int64_t era = floorDiv(z, 146097);
    const int64_t doe = z - era * 146097;
    const int64_t yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
    const int64_t doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
    const int64_t mp = (5 * doy + 2) / 153;
    d = static_cast<int32_t>(doy - (153 * mp + 2) / 5 + 1);
    m = static_cast<int32_t>(mp < 10 ? mp + 3 : mp - 9);
    y = yoe + era * 400 + (m <= 2);
}

// Status of a time-axis setter's file-type check: 0 when the file type takes
// the family, 1000 for the other family, 2010 for an unknown file type.
int32_t familyStatus(int32_t fileType, bool equidistant) {
    const bool eq = fileType == F_EQTIME_FIXEDSPACE_ALLITEMS || fileType == F_EQTIME_TVARSPACE_ALLITEMS;
    const bool neq = fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS || fileType == F_NEQTIME_FIXEDSPACE_VARITEMS ||
                     fileType == F_NEQTIME_TVARSPACE_VARITEMS;
    if (!eq && !neq) return F_ERR_VALUE;
    return eq == equidistant ? F_NO_ERROR : F_ERR_ARGUMENT;
}

bool isDigit(char c) { return c >= '0' && c <= '9'; }

// Exactly length characters: separators at the given positions, digits
// elsewhere. Values are not range-checked.
bool matchesPattern(const char* text, size_t length, char separator, size_t sep1, size_t sep2) {
    if (text == nullptr || std::strlen(text) != length) return false;
    for (size_t i = 0; i < length; ++i) {
        const bool isSep = i == sep1 || i == sep2;
        if (isSep ? text[i] != separator : !isDigit(text[i])) return false;
    }
    return true;
}

bool validDate(const char* text) { return matchesPattern(text, 10, '-', 4, 7); }  // yyyy-mm-dd
bool validTime(const char* text) { return matchesPattern(text, 8, ':', 2, 5); }   // hh:mm:ss

// Sets one of the calendar axes (type 3 or 4).
int32_t setCalendarAxis(HeaderHandle header, int32_t type, const char* startDate, const char* startTime,
                        int32_t unit, double startOffset, double timeStep, int32_t firstIndex,
                        const GrdApiTrace& trace, int32_t line) {
    int32_t status = grdCheckHeader(header, kModule, line);
    if (status != F_NO_ERROR) return status;
    status = familyStatus(header->fileType, type == F_CAL_EQ_AXIS);
    if (status != F_NO_ERROR) return grdReportError(header, nullptr, 0, status, kModule, line);
    // The type is set before the texts are tested: a bad text leaves it set
    // (and a bad time leaves the new date stored).
    GrdTimeAxis& axis = header->timeAxis;
    axis.type = type;
    if (!validDate(startDate)) {
        trace.print("F_ERR_DATE_FORMAT %d", F_ERR_DATE_FORMAT);
        return grdReportError(header, nullptr, 0, F_ERR_DATE_FORMAT, kModule, line);
    }
    std::memcpy(axis.startDate, startDate, sizeof axis.startDate);
    if (!validTime(startTime)) {
        trace.print("F_ERR_TIME_FORMAT %d", F_ERR_TIME_FORMAT);
        return grdReportError(header, nullptr, 0, F_ERR_TIME_FORMAT, kModule, line);
    }
    std::memcpy(axis.startTime, startTime, sizeof axis.startTime);
    GrdTimeValues& v = axis.calendar;
    v.unitText.reset();
    v.unit = unit;
    if (type == F_CAL_EQ_AXIS) {
        v.start = startOffset;
        v.step = timeStep;
    }
    v.firstIndex = firstIndex;
    trace.print("F_NO_ERROR = OK");
    return F_NO_ERROR;
}

// Gives one of the time-value axes (type 1 or 2).
int32_t getTimeAxis(HeaderHandle header, int32_t type, int32_t* unit, const char** unitText, double* startTime,
                    double* timeStep, int32_t* noOfTimeSteps, int32_t* firstIndex, int32_t line) {
    const int32_t status = grdCheckHeader(header, kModule, line);
    if (status != F_NO_ERROR) return status;
    if (header->timeAxis.type != type) return grdReportError(header, nullptr, 0, F_ERR_ARGUMENT, kModule, line);
    const GrdTimeValues& v = header->timeAxis.time;
    if (unit) *unit = v.unit;
    if (unitText) *unitText = grdUnitText(v.unit, v.unitText, unit);
    if (startTime) *startTime = v.start;
    if (timeStep) *timeStep = v.step;
    if (noOfTimeSteps) *noOfTimeSteps = v.timeSteps;
    if (firstIndex) *firstIndex = v.firstIndex;
    return F_NO_ERROR;
}

// Advances the given-out date and time texts by offset (in the axis unit).
// They stay as they are when the unit cannot be converted to seconds or the
// result has no four-digit year.
void applyOffset(GrdTimeAxis& axis, int32_t unit, double offset) {
    GrdDateTime t{};
    if (std::sscanf(axis.outDate, "%d-%d-%d", &t.year, &t.month, &t.day) != 3) return;
    if (std::sscanf(axis.outTime, "%d:%d:%d", &t.hour, &t.minute, &t.second) != 3) return;
    double seconds = 0.0;
    if (!qtyConvertUnit(unit, offset, QTY_UNIT_SECOND, &seconds)) return;
    // Texts hold whole seconds: round to the nearest one (a sum of fractional
    // units such as 0.1 h must not fall a second short).
    if (!(std::fabs(seconds) < 1e15)) return;
    const GrdDateTime r = grdSecondsToDateTime(grdDateTimeToSeconds(t) + std::llround(seconds));
    if (r.year < 0 || r.year > 9999) return;
    std::snprintf(axis.outDate, sizeof axis.outDate, "%.4d-%.2d-%.2d", r.year, r.month, r.day);
    std::snprintf(axis.outTime, sizeof axis.outTime, "%.2d:%.2d:%.2d", r.hour, r.minute, r.second);
}

// Gives one of the calendar axes (type 3 or 4).
int32_t getCalendarAxis(HeaderHandle header, int32_t type, int32_t* unit, const char** unitText,
                        const char** startDate, const char** startTime, double* startOffset, double* timeStep,
                        int32_t* noOfTimeSteps, int32_t* firstIndex, int32_t line) {
    const int32_t status = grdCheckHeader(header, kModule, line);
    if (status != F_NO_ERROR) return status;
    GrdTimeAxis& axis = header->timeAxis;
    if (axis.type != type) return grdReportError(header, nullptr, 0, F_ERR_ARGUMENT, kModule, line);
    std::memcpy(axis.outDate, axis.startDate, sizeof axis.outDate);
    std::memcpy(axis.outTime, axis.startTime, sizeof axis.outTime);
    const GrdTimeValues& v = axis.calendar;
    if (unit) *unit = v.unit;
    if (unitText) *unitText = grdUnitText(v.unit, v.unitText, unit);
    if (v.start != 0.0 && header->modifyTimes) applyOffset(axis, v.unit, v.start);
    if (startDate) *startDate = axis.outDate;
    if (startTime) *startTime = axis.outTime;
    if (startOffset) *startOffset = header->modifyTimes ? 0.0 : v.start;
    if (timeStep) *timeStep = v.step;
    if (noOfTimeSteps) *noOfTimeSteps = v.timeSteps;
    if (firstIndex) *firstIndex = v.firstIndex;
    return F_NO_ERROR;
}

}  // namespace

// ---- Date arithmetic --------------------------------------------------------------

int64_t grdDateTimeToSeconds(const GrdDateTime& t) noexcept {
    const int64_t months = int64_t{t.year} * 12 + (int64_t{t.month} - 1);
    const int64_t year = floorDiv(months, 12);
    const int64_t month = months - year * 12 + 1;
    const int64_t days = daysFromCivil(year, month, 1) + (int64_t{t.day} - 1);
    return days * kSecondsPerDay + int64_t{t.hour} * 3600 + int64_t{t.minute} * 60 + t.second;
}

GrdDateTime grdSecondsToDateTime(int64_t seconds) noexcept {
    const int64_t days = floorDiv(seconds, kSecondsPerDay);
    const int64_t rest = seconds - days * kSecondsPerDay;
    GrdDateTime t{};
    int64_t year = 0;
    civilFromDays(days, year, t.month, t.day);
    t.year = static_cast<int32_t>(year);
    t.hour = static_cast<int32_t>(rest / 3600);
    t.minute = static_cast<int32_t>(rest / 60 % 60);
    t.second = static_cast<int32_t>(rest % 60);
    return t;
}

extern "C" {

// ---- Setters ------------------------------------------------------------------------

int32_t TOVA_CALL grdSetEqTimeAxis(HeaderHandle header, int32_t unit, double startTime, double timeStep,
                                   int32_t firstIndex) {
    GrdApiTrace trace("grdSetEqTimeAxis %d %g %g %d", unit, startTime, timeStep, firstIndex);
    int32_t status = grdCheckHeader(header, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    status = familyStatus(header->fileType, true);
    if (status == F_NO_ERROR && !(timeStep > 0.0)) status = F_ERR_ARGUMENT;
    if (status != F_NO_ERROR) return trace.done(grdReportError(header, nullptr, 0, status, kModule, __LINE__));
    GrdTimeValues& v = header->timeAxis.time;
    v.unitText.reset();
    v.unit = unit;
    v.start = startTime;
    v.step = timeStep;
    v.firstIndex = firstIndex;
    header->timeAxis.type = F_TM_EQ_AXIS;
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdSetNeqTimeAxis(HeaderHandle header, int32_t unit, double startTime, int32_t firstIndex) {
    GrdApiTrace trace("grdSetNeqTimeAxis %d %g %d", unit, startTime, firstIndex);
    int32_t status = grdCheckHeader(header, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    status = familyStatus(header->fileType, false);
    if (status != F_NO_ERROR) return trace.done(grdReportError(header, nullptr, 0, status, kModule, __LINE__));
    // The start time is taken from the first time step written.
    GrdTimeValues& v = header->timeAxis.time;
    v.unitText.reset();
    v.unit = unit;
    v.firstIndex = firstIndex;
    header->timeAxis.type = F_TM_NEQ_AXIS;
    return trace.done(F_NO_ERROR);
}

int32_t TOVA_CALL grdSetEqCalendarAxis(HeaderHandle header, const char* startDate, const char* startTime,
                                       int32_t unit, double startOffset, double timeStep, int32_t firstIndex) {
    GrdApiTrace trace("grdSetEqCalendarAxis <%s> <%s> %d %g %g %d", grdTraceText(startDate),
                      grdTraceText(startTime), unit, startOffset, timeStep, firstIndex);
    return trace.done(setCalendarAxis(header, F_CAL_EQ_AXIS, startDate, startTime, unit, startOffset, timeStep,
                                      firstIndex, trace, __LINE__));
}

int32_t TOVA_CALL grdSetNeqCalendarAxis(HeaderHandle header, const char* startDate, const char* startTime,
                                        int32_t unit, double startOffset, int32_t firstIndex) {
    GrdApiTrace trace("grdSetNeqCalendarAxis <%s> <%s> %d %g %d", grdTraceText(startDate),
                      grdTraceText(startTime), unit, startOffset, firstIndex);
    return trace.done(setCalendarAxis(header, F_CAL_NEQ_AXIS, startDate, startTime, unit, startOffset, 0.0,
                                      firstIndex, trace, __LINE__));
}

// ---- Getters ---------------------------------------------------------------------------

int32_t TOVA_CALL grdGetTimeAxisType(HeaderHandle header) {
    return grdTracedGet("grdGetTimeAxisType", header, grdCheckHeader, kModule, __LINE__, 0,
                        [](HeaderHandle h) { return h->timeAxis.type; });
}

int32_t TOVA_CALL grdGetEqTimeAxis(HeaderHandle header, int32_t* unit, const char** unitText, double* startTime,
                                   double* timeStep, int32_t* noOfTimeSteps, int32_t* firstIndex) {
    GrdApiTrace trace("grdGetEqTimeAxis");
    return trace.done(getTimeAxis(header, F_TM_EQ_AXIS, unit, unitText, startTime, timeStep, noOfTimeSteps,
                                  firstIndex, __LINE__));
}

int32_t TOVA_CALL grdGetNeqTimeAxis(HeaderHandle header, int32_t* unit, const char** unitText, double* startTime,
                                    double* timeStep, int32_t* noOfTimeSteps, int32_t* firstIndex) {
    GrdApiTrace trace("grdGetNeqTimeAxis");
    return trace.done(getTimeAxis(header, F_TM_NEQ_AXIS, unit, unitText, startTime, timeStep, noOfTimeSteps,
                                  firstIndex, __LINE__));
}

int32_t TOVA_CALL grdGetEqCalendarAxis(HeaderHandle header, int32_t* unit, const char** unitText,
                                       const char** startDate, const char** startTime, double* startOffset,
                                       double* timeStep, int32_t* noOfTimeSteps, int32_t* firstIndex) {
    GrdApiTrace trace("grdGetEqCalendarAxis");
    return trace.done(getCalendarAxis(header, F_CAL_EQ_AXIS, unit, unitText, startDate, startTime, startOffset,
                                      timeStep, noOfTimeSteps, firstIndex, __LINE__));
}

int32_t TOVA_CALL grdGetNeqCalendarAxis(HeaderHandle header, int32_t* unit, const char** unitText,
                                        const char** startDate, const char** startTime, double* startOffset,
                                        double* timeStep, int32_t* noOfTimeSteps, int32_t* firstIndex) {
    GrdApiTrace trace("grdGetNeqCalendarAxis");
    return trace.done(getCalendarAxis(header, F_CAL_NEQ_AXIS, unit, unitText, startDate, startTime, startOffset,
                                      timeStep, noOfTimeSteps, firstIndex, __LINE__));
}

int32_t TOVA_CALL _grdGetTimeAxisSpan(HeaderHandle header, FileHandle file, double* span) {
    GrdApiTrace trace("_grdGetTimeAxisSpan");
    if (span) *span = F_DELETE_VALUE_DOUBLE;
    const int32_t status = grdCheckHeaderFile(header, file, kModule, __LINE__);
    if (status != F_NO_ERROR) return trace.done(status);
    const GrdTimeAxis& axis = header->timeAxis;
    switch (axis.type) {
        case F_TM_EQ_AXIS:
        case F_CAL_EQ_AXIS: {
            // One step past the last time step, by design.
            const GrdTimeValues& v = axis.type == F_TM_EQ_AXIS ? axis.time : axis.calendar;
            if (span) *span = v.timeSteps * v.step;
            return trace.done(F_NO_ERROR);
        }
        case F_TM_NEQ_AXIS:
        case F_CAL_NEQ_AXIS: {
            // The time of the last time step, read from the file; the file is
            // left at the start of its static data.
            const GrdTimeValues& v = axis.type == F_TM_NEQ_AXIS ? axis.time : axis.calendar;
            const double start = v.start;
            int32_t s = grdFindTimeStep(header, file, v.timeSteps - 1);
            double last = 0.0;
            if (s == F_NO_ERROR) s = grdReadItemTimeStep(header, file, &last, nullptr);
            if (s == F_NO_ERROR) s = grdFindBlockStatic(header, file);
            if (s != F_NO_ERROR) return trace.done(s);
            // With the modify-times switch on, the read gives the time relative
            // to the start already.
            if (span) *span = header->modifyTimes != 0 ? last : last - start;
            return trace.done(F_NO_ERROR);
        }
        default:
            return trace.done(F_NO_ERROR);
    }
}

}  // extern "C"
