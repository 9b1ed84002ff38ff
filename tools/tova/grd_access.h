// Gridded data files as the tool sees them through the public API: an open
// file with its header (closed and freed at the end of the scope), static
// items, what an item's getters say about it, the time axis with the date and
// time of any time step, and the texts of floats, simple types and axis kinds
// shared by info, dump, stats and check.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <type_traits>

#include "json.h"
#include "tova/grd.h"
#include "tova_cli.h"

namespace tova_cli {

// A gridded data file opened for reading with its header.
class GridFile {
public:
    // Failure with a readable message when the library cannot open it.
    explicit GridFile(const std::string& path);
    // No throw: *status gets the open status; the object is empty unless 0.
    GridFile(const std::string& path, int32_t* status);
    ~GridFile();
    GridFile(const GridFile&) = delete;
    GridFile& operator=(const GridFile&) = delete;

    HeaderHandle header() const { return header_; }
    FileHandle file() const { return file_; }
    explicit operator bool() const { return header_ != nullptr && file_ != nullptr; }

private:
    void close() noexcept;

    HeaderHandle header_ = nullptr;
    FileHandle file_ = nullptr;
};

struct StaticFree {
    void operator()(ItemHandle item) const { grdStaticDestroy(&item); }
};
using StaticPtr = std::unique_ptr<std::remove_pointer_t<ItemHandle>, StaticFree>;

// The record-file header of path; Failure unless it is a gridded data file.
RecordFileInfo probeGridFile(const std::string& path);
// Bytes of the value array of an item (elements of a simple type); Failure
// with what as the subject when no file of fileSize bytes could fill it (a
// compressed item is read into its whole grid, so up to 64 times the file).
size_t valueBytes(int64_t elements, int32_t type, uint64_t fileSize, const std::string& what);

// The next static item of the file, or null at the end of the static section
// (*status 0) or on failure.
StaticPtr readStatic(FileHandle file, int32_t* status);

// The mean over all values of dynamic item n from the per-element means and
// counts the file keeps (statistics types 2 and 3); NaN without them.
double storedMean(HeaderHandle header, int32_t n);

// Name, quantity and unit of an item as the unit library names them.
struct ItemInfo {
    std::string name;
    int32_t quantity = 0;
    std::string quantityText;
    int32_t unit = 0;
    std::string unitText;
    int32_t dataType = 0;
};
ItemInfo itemInfo(ItemHandle item);

// The spatial axis of an item as its getters give it.
struct Geometry {
    int32_t type = 0;      // ItemAxisType
    int32_t dims = 0;      // directions with a size, 0 to 4
    int32_t size[4] = {};  // per direction, x first
    bool equidistant = false;
    float origin[4] = {};  // equidistant axes
    float step[4] = {};
    bool coordinates = false;  // non-equidistant axes: the first boundary per direction
    double first[3] = {};
    int64_t elements = 0;  // product of the sizes (1 for a single value)
    int32_t unit = 0;
    std::string unitText;
};
Geometry itemGeometry(ItemHandle item);

// "EqD2", "NeqD1", "CurveLinearD3", "undefined" and the like.
const char* axisName(int32_t axisType);
// Sizes, origins and steps of an axis as report values (null when the axis
// kind has none).
Value sizesValue(const Geometry& g);
Value originValue(const Geometry& g);
Value stepValue(const Geometry& g);

// Bytes of one element of simple type 1-7; 0 for any other type.
size_t elementSize(int32_t simpleType);
// "float", "double", ... as the record-file layer names them.
std::string typeName(int32_t simpleType);

// Shortest text that reads back to the same float; and that number as a
// report value (a double with the same shortest text).
std::string formatFloat(float f);
Value floatValue(float f);

// The time axis of a header, with the time of its time steps.
struct TimeAxis {
    int32_t type = 0;  // TimeAxisType
    bool calendar = false;
    bool equidistant = false;
    int32_t unit = 0;
    std::string unitText;
    std::string startDate;  // calendar axes, the start offset already applied
    std::string startTime;
    double start = 0;  // time axes: the start time; calendar axes: the offset left
    double step = 0;   // equidistant axes: the step; others: the span
    int32_t timeSteps = 0;
    int32_t firstIndex = 0;
    double unitSeconds = 0;  // seconds per unit, 0 when the unit is no time unit

    // The time rel units after the start: a date and time for calendar
    // axes, a number for time axes (text: with its unit).
    std::string value(double rel) const;
    std::string text(double rel) const;
    // Time of step t of an equidistant axis, relative to the start.
    double stepOffset(int64_t t) const { return static_cast<double>(t) * step; }
    // The time of the last time step relative to the start, when known.
    double lastOffset() const;
};
// The header's time axis (type 0 when it has none). The calendar getters run
// with the modify-times flag set, so that dates already include the offset.
TimeAxis timeAxis(HeaderHandle header);

// Days since 1970-01-01 of a date of the proleptic Gregorian calendar.
int64_t daysFromCivil(int64_t y, int64_t m, int64_t d);

// The date and time of a calendar start advanced by seconds:
// "yyyy-mm-dd hh:mm:ss", with a fraction of a second when there is one.
std::string advanceDate(const std::string& date, const std::string& time, double seconds);

}  // namespace tova_cli
