// Which items, time steps and grid cells a command works on, as `dump`,
// `stats`, `info` and `plot` take them from the command line: items by number
// or by name (exact, then without regard to case, then a unique prefix),
// time steps by number, range or date (exact or nearest), and index ranges
// per axis. Every value out of range gets a sentence with the valid range.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "grd_access.h"

namespace tova_cli {

// "A", "A:B", "A:" or ":B" of whole numbers, inclusive; a negative number
// counts from the end (-1 is the last). Null when text has another form.
struct IndexRange {
    std::optional<int64_t> first;
    std::optional<int64_t> last;
};
std::optional<IndexRange> parseRange(const std::string& text);

// The selection options as given on the command line.
struct Selection {
    std::vector<std::string> items;                  // numbers or names; a text may list several with commas
    std::optional<std::string> time;                 // number, range, date or "date/date"
    bool nearest = false;                            // a date takes the nearest time step
    std::array<std::optional<std::string>, 3> axes;  // --x, --y, --z
};

// The 1-based number of key among names: a number in range, else the name
// exactly, then without regard to case, then the one name it begins (without
// regard to case). Failure with the valid numbers and the names otherwise.
// what: "item" or "static item".
int32_t findByName(const std::vector<std::string>& names, const std::string& key, const std::string& what,
                   const std::string& path);

// The items a selection names, in the order given (all items when none).
std::vector<int32_t> selectItems(HeaderHandle header, const std::vector<std::string>& keys, const std::string& path);
// The names of the header's items.
std::vector<std::string> itemNames(HeaderHandle header);

// Time steps first..last (inclusive) of a selection; all when text is absent.
// The times of a non-equidistant axis are read from the file.
struct StepSpan {
    int64_t first = 0;
    int64_t last = -1;
    int64_t count() const { return last >= first ? last - first + 1 : 0; }
};
StepSpan selectSteps(const GridFile& grid, const TimeAxis& axis, const std::optional<std::string>& text,
                     bool nearest, const std::string& path);

// The cells of an item that a selection keeps: an index range per direction
// (x, y, z; a fourth direction is always whole).
class Box {
public:
    // label names the item in messages ("item 1 \"level\"").
    Box(const Geometry& g, const std::array<std::optional<std::string>, 3>& axes, const std::string& label);

    bool whole() const { return whole_; }
    int64_t count() const;
    // Element number e lies in the box.
    bool contains(int64_t e) const;
    // Calls f(first, length) for each run of consecutive elements in the box,
    // in element order.
    template <class F>
    void forEachRun(F&& f) const {
        const int64_t nx = size_[0], ny = size_[1], nz = size_[2];
        for (int64_t l = lo_[3]; l <= hi_[3]; ++l) {
            for (int64_t k = lo_[2]; k <= hi_[2]; ++k) {
                for (int64_t j = lo_[1]; j <= hi_[1]; ++j) f(((l * nz + k) * ny + j) * nx + lo_[0], hi_[0] - lo_[0] + 1);
            }
        }
    }
    int64_t size(int d) const { return size_[d]; }

private:
    int64_t size_[4] = {1, 1, 1, 1};
    int64_t lo_[4] = {};
    int64_t hi_[4] = {};
    bool whole_ = true;
};

// Seconds since 1970-01-01 00:00:00 of "yyyy-mm-dd", "yyyy-mm-ddThh:mm",
// "yyyy-mm-dd hh:mm:ss" (seconds may have a fraction); null for other texts.
std::optional<double> parseDateTime(const std::string& text);

}  // namespace tova_cli
