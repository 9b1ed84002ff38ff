// Gridded data files through the public API (see grd_access.h): opening,
// item and axis getters gathered into plain structs, and the arithmetic of
// calendar dates for the times of time steps.
#include "grd_access.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <cstdlib>

#include "qty/qty.h"
#include "tova/rcf.h"

namespace tova_cli {

GridFile::GridFile(const std::string& path, int32_t* status) {
    *status = grdFileRead(path.c_str(), &header_, &file_);
    if (*status != F_NO_ERROR || header_ == nullptr || file_ == nullptr) {
        if (*status == F_NO_ERROR) *status = F_ERR_READ;
        close();
    }
}

GridFile::GridFile(const std::string& path) {
    int32_t status = 0;
    GridFile opened(path, &status);
    if (status != F_NO_ERROR) {
        throw Failure(path + ": the gridded data-file reader refuses the file: status " + statusText(status));
    }
    std::swap(header_, opened.header_);
    std::swap(file_, opened.file_);
}

GridFile::~GridFile() { close(); }

void GridFile::close() noexcept {
    if (file_ != nullptr) {
        // A file opened for reading only needs no header update on close.
        if (header_ == nullptr || grdFileClose(header_, &file_) != F_NO_ERROR) rcfFileClose(&file_);
    }
    if (header_ != nullptr) grdHeaderDestroy(&header_);
}

RecordFileInfo probeGridFile(const std::string& path) {
    RecordFileInfo file = probeRecordFile(path);
    if (file.kind != FileKind::Grid) {
        throw Failure(path + " is no gridded data file (it is a " + kindDescription(file.kind) + ")");
    }
    return file;
}

size_t valueBytes(int64_t elements, int32_t type, uint64_t fileSize, const std::string& what) {
    const size_t size = elementSize(type);
    if (size == 0) throw Failure(what + " has data type " + std::to_string(type) + ", no simple type");
    const uint64_t bytes = static_cast<uint64_t>(std::max<int64_t>(elements, 0)) * size;
    if (elements > (int64_t{1} << 40) || bytes > std::max<uint64_t>(64 * fileSize, uint64_t{1} << 30)) {
        throw Failure(what + " claims " + std::to_string(elements) + " values, far more than the file can hold");
    }
    return static_cast<size_t>(bytes);
}

StaticPtr readStatic(FileHandle file, int32_t* status) {
    *status = F_NO_ERROR;
    return StaticPtr(grdStaticRead(file, status));
}

double storedMean(HeaderHandle header, int32_t n) {
    const int32_t type = grdGetItemStatsType(header);
    if (type != F_ITEM_STATS_ELEMENT && type != F_ITEM_STATS_ELEMENT_ALT) return std::nan("");
    double sum = 0;
    int64_t count = 0;
    const int32_t used = grdGetUsedItemElements(grdItemD(header, n));
    for (int32_t e = 0; e < used; ++e) {
        double mean = 0;
        int32_t values = 0;
        if (grdGetItemStats(header, n, e, nullptr, nullptr, &mean, nullptr, nullptr, &values, nullptr, nullptr) !=
            F_NO_ERROR) {
            return std::nan("");
        }
        if (values > 0) {
            sum += mean * values;
            count += values;
        }
    }
    return count > 0 ? sum / static_cast<double>(count) : std::nan("");
}

ItemInfo itemInfo(ItemHandle item) {
    ItemInfo info;
    const char* quantityText = nullptr;
    const char* name = nullptr;
    const char* unitText = nullptr;
    grdGetItemInfo(item, &info.quantity, &quantityText, &name, &info.unit, &unitText, &info.dataType);
    info.name = name != nullptr ? name : "";
    info.quantityText = quantityText != nullptr ? quantityText : "";
    info.unitText = unitText != nullptr ? unitText : "";
    return info;
}

const char* axisName(int32_t axisType) {
    static const char* const kNames[] = {"undefined", "EqD0", "EqD1",  "NeqD1", "TvarD1", "EqD2",          "NeqD2",
                                         "TvarD2",    "EqD3", "NeqD3", "TvarD3", "EqD4",  "CurveLinearD2", "CurveLinearD3"};
    return axisType >= 0 && axisType <= F_CURVE_LINEAR_AXIS_D3 ? kNames[axisType] : "unknown";
}

Geometry itemGeometry(ItemHandle item) {
    Geometry g;
    g.type = grdGetItemAxisType(item);
    const char* unitText = nullptr;
    int32_t* s = g.size;
    float* o = g.origin;
    float* d = g.step;
    const double* c[3] = {};
    switch (g.type) {
    case F_EQ_AXIS_D0: grdGetItemAxisEqD0(item, &g.unit, &unitText); break;
    case F_EQ_AXIS_D1: grdGetItemAxisEqD1(item, &g.unit, &unitText, &s[0], &o[0], &d[0]); break;
    case F_EQ_AXIS_D2: grdGetItemAxisEqD2(item, &g.unit, &unitText, &s[0], &s[1], &o[0], &o[1], &d[0], &d[1]); break;
    case F_EQ_AXIS_D3:
        grdGetItemAxisEqD3(item, &g.unit, &unitText, &s[0], &s[1], &s[2], &o[0], &o[1], &o[2], &d[0], &d[1], &d[2]);
        break;
    case F_EQ_AXIS_D4:
        grdGetItemAxisEqD4(item, &g.unit, &unitText, &s[0], &s[1], &s[2], &s[3], &o[0], &o[1], &o[2], &o[3], &d[0],
                           &d[1], &d[2], &d[3]);
        break;
    case F_NEQ_AXIS_D1: grdGetItemAxisNeqD1(item, &g.unit, &unitText, &s[0], &c[0]); break;
    case F_NEQ_AXIS_D2: grdGetItemAxisNeqD2(item, &g.unit, &unitText, &s[0], &s[1], &c[0], &c[1]); break;
    case F_NEQ_AXIS_D3:
        grdGetItemAxisNeqD3(item, &g.unit, &unitText, &s[0], &s[1], &s[2], &c[0], &c[1], &c[2]);
        break;
    case F_TVAR_AXIS_D1: grdGetItemAxisTvarD1(item, &g.unit, &unitText, &s[0]); break;
    case F_TVAR_AXIS_D2: grdGetItemAxisTvarD2(item, &g.unit, &unitText, &s[0], &s[1]); break;
    case F_TVAR_AXIS_D3: grdGetItemAxisTvarD3(item, &g.unit, &unitText, &s[0], &s[1], &s[2]); break;
    case F_CURVE_LINEAR_AXIS_D2: grdGetItemAxisCurveLinearD2(item, &g.unit, &unitText, &s[0], &s[1], &c[0], &c[1]); break;
    case F_CURVE_LINEAR_AXIS_D3:
        grdGetItemAxisCurveLinearD3(item, &g.unit, &unitText, &s[0], &s[1], &s[2], &c[0], &c[1], &c[2]);
        break;
    default: break;
    }
    static constexpr int8_t kDims[] = {0, 0, 1, 1, 1, 2, 2, 2, 3, 3, 3, 4, 2, 3};
    g.dims = g.type >= 0 && g.type <= F_CURVE_LINEAR_AXIS_D3 ? kDims[g.type] : 0;
    g.equidistant = g.type == F_EQ_AXIS_D1 || g.type == F_EQ_AXIS_D2 || g.type == F_EQ_AXIS_D3 || g.type == F_EQ_AXIS_D4;
    g.coordinates = g.type == F_NEQ_AXIS_D1 || g.type == F_NEQ_AXIS_D2 || g.type == F_NEQ_AXIS_D3;
    for (int32_t k = 0; k < 3 && g.coordinates; ++k) g.first[k] = c[k] != nullptr ? c[k][0] : 0.0;
    g.elements = g.type == F_UNDEFINED_AXIS ? 0 : 1;
    for (int32_t k = 0; k < g.dims; ++k) g.elements *= g.size[k] > 0 ? g.size[k] : 0;
    g.unitText = unitText != nullptr ? unitText : "";
    return g;
}

Value sizesValue(const Geometry& g) {
    if (g.dims == 0) return nullptr;
    Value sizes = Value::array();
    for (int32_t k = 0; k < g.dims; ++k) sizes.push(g.size[k]);
    return sizes;
}

Value originValue(const Geometry& g) {
    if (!g.equidistant && !g.coordinates) return nullptr;
    Value origin = Value::array();
    for (int32_t k = 0; k < g.dims; ++k) origin.push(g.equidistant ? floatValue(g.origin[k]) : Value(g.first[k]));
    return origin;
}

Value stepValue(const Geometry& g) {
    if (!g.equidistant) return nullptr;
    Value step = Value::array();
    for (int32_t k = 0; k < g.dims; ++k) step.push(floatValue(g.step[k]));
    return step;
}

size_t elementSize(int32_t simpleType) { return simpleType >= 1 && simpleType <= 7 ? rcfSimpSize(simpleType) : 0; }

std::string typeName(int32_t simpleType) {
    if (elementSize(simpleType) == 0) return "type " + std::to_string(simpleType);
    return rcfSimpName(simpleType);
}

std::string formatFloat(float f) {
    if (std::isnan(f)) return "nan";
    if (std::isinf(f)) return f < 0 ? "-inf" : "inf";
    char buffer[32];
    const auto result = std::to_chars(buffer, buffer + sizeof(buffer), f);
    return std::string(buffer, result.ptr);
}

Value floatValue(float f) {
    if (!std::isfinite(f)) return static_cast<double>(f);
    return std::strtod(formatFloat(f).c_str(), nullptr);
}

// Days since 1970-01-01 of a date of the proleptic Gregorian calendar.
int64_t daysFromCivil(int64_t y, int64_t m, int64_t d) {
    y -= m <= 2 ? 1 : 0;
    const int64_t era = (y >= 0 ? y : y - 399) / 400;
    const int64_t yoe = y - era * 400;
    const int64_t doy = (153 * (m + (m > 2 ? -3 : 9)) + 2) / 5 + d - 1;
    const int64_t doe = yoe * 365 + yoe / 4 - yoe / 100 + doy;
    return era * 146097 + doe - 719468;
}

namespace {

void civilFromDays(int64_t z, int64_t* y, int64_t* m, int64_t* d) {
    z += 719468;
    const int64_t era = (z >= 0 ? z : z - 146096) / 146097;
    const int64_t doe = z - era * 146097;
    const int64_t yoe = (doe - doe / 1460 + doe / 36524 - doe / 146096) / 365;
    const int64_t doy = doe - (365 * yoe + yoe / 4 - yoe / 100);
    const int64_t mp = (5 * doy + 2) / 153;
    *d = doy - (153 * mp + 2) / 5 + 1;
    *m = mp + (mp < 10 ? 3 : -9);
    *y = yoe + era * 400 + (*m <= 2 ? 1 : 0);
}

int64_t floorDiv(int64_t a, int64_t b) { return a / b - ((a % b != 0 && (a < 0) != (b < 0)) ? 1 : 0); }

}  // namespace

std::string advanceDate(const std::string& date, const std::string& time, double seconds) {
    int year = 0, month = 0, day = 0, hour = 0, minute = 0, second = 0;
    if (std::sscanf(date.c_str(), "%d-%d-%d", &year, &month, &day) != 3 ||
        std::sscanf(time.c_str(), "%d:%d:%d", &hour, &minute, &second) != 3) {
        return date + " " + time;
    }
    // About 290 000 years either way: beyond, a date means nothing.
    constexpr double kLimit = 9.0e15;
    if (!std::isfinite(seconds) || std::fabs(seconds) > kLimit) return date + " " + time + " + ?";
    // Digits of the start are not range-checked: month 13 is the next January.
    const int64_t m0 = month - 1;
    const int64_t y = year + floorDiv(m0, 12);
    const int64_t m = m0 - 12 * floorDiv(m0, 12) + 1;
    const int64_t startDay = daysFromCivil(y, m, 1) + (day - 1);
    const double whole = std::floor(seconds);
    double fraction = seconds - whole;
    auto total = startDay * 86400 + int64_t{hour} * 3600 + int64_t{minute} * 60 + second + static_cast<int64_t>(whole);
    // Milliseconds are shown; a fraction that rounds to a whole second is one.
    auto millis = static_cast<int64_t>(std::llround(fraction * 1000.0));
    if (millis == 1000) {
        ++total;
        millis = 0;
    }
    int64_t yy = 0, mm = 0, dd = 0;
    civilFromDays(floorDiv(total, 86400), &yy, &mm, &dd);
    const int64_t secs = total - 86400 * floorDiv(total, 86400);
    char text[128];
    std::snprintf(text, sizeof(text), "%04lld-%02lld-%02lld %02lld:%02lld:%02lld", static_cast<long long>(yy),
                  static_cast<long long>(mm), static_cast<long long>(dd), static_cast<long long>(secs / 3600),
                  static_cast<long long>(secs / 60 % 60), static_cast<long long>(secs % 60));
    std::string out = text;
    if (millis != 0) {
        std::snprintf(text, sizeof(text), ".%03lld", static_cast<long long>(millis));
        out += text;
    }
    return out;
}

TimeAxis timeAxis(HeaderHandle header) {
    TimeAxis axis;
    axis.type = grdGetTimeAxisType(header);
    const char* unitText = nullptr;
    const char* date = nullptr;
    const char* time = nullptr;
    switch (axis.type) {
    case F_TM_EQ_AXIS:
        grdGetEqTimeAxis(header, &axis.unit, &unitText, &axis.start, &axis.step, &axis.timeSteps, &axis.firstIndex);
        break;
    case F_TM_NEQ_AXIS:
        grdGetNeqTimeAxis(header, &axis.unit, &unitText, &axis.start, &axis.step, &axis.timeSteps, &axis.firstIndex);
        break;
    case F_CAL_EQ_AXIS:
    case F_CAL_NEQ_AXIS: {
        grdParamModifyTimes(header, 1);
        const auto get = axis.type == F_CAL_EQ_AXIS ? grdGetEqCalendarAxis : grdGetNeqCalendarAxis;
        get(header, &axis.unit, &unitText, &date, &time, &axis.start, &axis.step, &axis.timeSteps, &axis.firstIndex);
        axis.calendar = true;
        break;
    }
    default: return axis;
    }
    axis.equidistant = axis.type == F_TM_EQ_AXIS || axis.type == F_CAL_EQ_AXIS;
    axis.unitText = unitText != nullptr ? unitText : "";
    axis.startDate = date != nullptr ? date : "";
    axis.startTime = time != nullptr ? time : "";
    double seconds = 0;
    if (qtyConvertUnit(axis.unit, 1.0, QTY_UNIT_SECOND, &seconds) && std::isfinite(seconds) && seconds > 0) {
        axis.unitSeconds = seconds;
    }
    return axis;
}

std::string TimeAxis::value(double rel) const {
    if (calendar && unitSeconds > 0) return advanceDate(startDate, startTime, (start + rel) * unitSeconds);
    // A calendar whose unit is no time unit: the start and the offset.
    if (calendar) return startDate + " " + startTime + " +" + formatDouble(start + rel);
    return formatDouble(start + rel);
}

std::string TimeAxis::text(double rel) const {
    const std::string v = value(rel);
    return unitText.empty() || (calendar && unitSeconds > 0) ? v : v + " " + unitText;
}

double TimeAxis::lastOffset() const {
    if (timeSteps <= 0) return 0;
    return equidistant ? stepOffset(timeSteps - 1) : step;
}

}  // namespace tova_cli
