// Selection of items, time steps and cells (see selection.h).
#include "selection.h"

#include <algorithm>
#include <cctype>
#include <cmath>
#include <cstdio>
#include <vector>

namespace tova_cli {

namespace {

std::optional<int64_t> wholeNumber(const std::string& text) {
    if (text.empty() || text.size() > 18) return std::nullopt;
    size_t i = text[0] == '-' ? 1 : 0;
    if (i == text.size()) return std::nullopt;
    int64_t value = 0;
    for (; i < text.size(); ++i) {
        if (!std::isdigit(static_cast<unsigned char>(text[i]))) return std::nullopt;
        value = value * 10 + (text[i] - '0');
    }
    return text[0] == '-' ? -value : value;
}

std::string lower(std::string s) {
    std::transform(s.begin(), s.end(), s.begin(), [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return s;
}

std::string quoted(const std::string& s) { return "\"" + s + "\""; }

std::string nameList(const std::vector<std::string>& names) {
    std::string list;
    for (size_t n = 0; n < names.size(); ++n) list += (n == 0 ? "" : ", ") + std::to_string(n + 1) + " " + quoted(names[n]);
    return list;
}

// An index of a range: from the end when negative; null when outside 0..size-1.
std::optional<int64_t> resolve(int64_t index, int64_t size) {
    const int64_t i = index < 0 ? size + index : index;
    if (i < 0 || i >= size) return std::nullopt;
    return i;
}

}  // namespace

std::optional<IndexRange> parseRange(const std::string& text) {
    const size_t colon = text.find(':');
    if (colon == std::string::npos) {
        const auto n = wholeNumber(text);
        if (!n) return std::nullopt;
        return IndexRange{n, n};
    }
    IndexRange range;
    const std::string first = text.substr(0, colon);
    const std::string last = text.substr(colon + 1);
    if (!first.empty() && !(range.first = wholeNumber(first))) return std::nullopt;
    if (!last.empty() && !(range.last = wholeNumber(last))) return std::nullopt;
    if (first.empty() && last.empty() && text != ":") return std::nullopt;
    return range;
}

int32_t findByName(const std::vector<std::string>& names, const std::string& key, const std::string& what,
                   const std::string& path) {
    const auto count = static_cast<int64_t>(names.size());
    if (const auto n = wholeNumber(key)) {
        if (*n >= 1 && *n <= count) return static_cast<int32_t>(*n);
        throw Failure(path + " has no " + what + " " + key +
                      (count == 0 ? " (it has none)" : " (" + what + "s 1 to " + std::to_string(count) + ": " +
                                                           nameList(names) + ")"));
    }
    for (size_t n = 0; n < names.size(); ++n) {
        if (names[n] == key) return static_cast<int32_t>(n + 1);
    }
    const std::string wanted = lower(key);
    std::vector<size_t> exact, prefix;
    for (size_t n = 0; n < names.size(); ++n) {
        const std::string name = lower(names[n]);
        if (name == wanted) exact.push_back(n);
        if (name.compare(0, wanted.size(), wanted) == 0) prefix.push_back(n);
    }
    if (exact.size() == 1) return static_cast<int32_t>(exact[0] + 1);
    if (exact.empty() && prefix.size() == 1 && !wanted.empty()) return static_cast<int32_t>(prefix[0] + 1);
    const std::vector<size_t>& several = exact.size() > 1 ? exact : prefix;
    if (several.size() > 1 && !wanted.empty()) {
        std::string list;
        for (const size_t n : several) list += (list.empty() ? "" : ", ") + std::to_string(n + 1) + " " + quoted(names[n]);
        throw Failure(path + ": " + quoted(key) + " names more than one " + what + " (" + list +
                      "): give more of the name or the number");
    }
    throw Failure(path + " has no " + what + " named " + quoted(key) +
                  (count == 0 ? " (it has none)" : "; its " + what + "s: " + nameList(names)));
}

std::vector<std::string> itemNames(HeaderHandle header) {
    std::vector<std::string> names;
    const int32_t items = grdGetNoOfItems(header);
    for (int32_t n = 1; n <= items; ++n) names.push_back(itemInfo(grdItemD(header, n)).name);
    return names;
}

std::vector<int32_t> selectItems(HeaderHandle header, const std::vector<std::string>& keys, const std::string& path) {
    const std::vector<std::string> names = itemNames(header);
    std::vector<int32_t> numbers;
    if (keys.empty()) {
        for (size_t n = 1; n <= names.size(); ++n) numbers.push_back(static_cast<int32_t>(n));
        return numbers;
    }
    const auto add = [&](int32_t n) {
        if (std::find(numbers.begin(), numbers.end(), n) == numbers.end()) numbers.push_back(n);
    };
    for (const std::string& key : keys) {
        // A name may hold a comma itself: the whole text is tried first.
        const bool whole = std::find(names.begin(), names.end(), key) != names.end();
        if (whole || key.find(',') == std::string::npos) {
            add(findByName(names, key, "item", path));
            continue;
        }
        size_t begin = 0;
        for (;;) {
            const size_t comma = key.find(',', begin);
            const std::string part = key.substr(begin, comma == std::string::npos ? std::string::npos : comma - begin);
            if (!part.empty()) add(findByName(names, part, "item", path));
            if (comma == std::string::npos) break;
            begin = comma + 1;
        }
    }
    return numbers;
}

std::optional<double> parseDateTime(const std::string& text) {
    int year = 0, month = 0, day = 0, hour = 0, minute = 0, used = 0;
    if (std::sscanf(text.c_str(), "%4d-%2d-%2d%n", &year, &month, &day, &used) != 3) return std::nullopt;
    double second = 0;
    std::string rest = text.substr(static_cast<size_t>(used));
    if (!rest.empty()) {
        if (rest[0] != 'T' && rest[0] != ' ') return std::nullopt;
        rest = rest.substr(1);
        int consumed = 0;
        if (std::sscanf(rest.c_str(), "%2d:%2d%n", &hour, &minute, &consumed) != 2) return std::nullopt;
        rest = rest.substr(static_cast<size_t>(consumed));
        if (!rest.empty()) {
            if (rest[0] != ':' || rest.size() < 2 || !std::isdigit(static_cast<unsigned char>(rest[1]))) return std::nullopt;
            char* end = nullptr;
            second = std::strtod(rest.c_str() + 1, &end);
            if (*end != '\0' || second < 0 || second >= 61) return std::nullopt;
        }
    }
    if (month < 1 || month > 12 || day < 1 || day > 31 || hour > 23 || minute > 59 || hour < 0 || minute < 0) {
        return std::nullopt;
    }
    return static_cast<double>(daysFromCivil(year, month, day)) * 86400.0 + hour * 3600.0 + minute * 60.0 + second;
}

namespace {

// The times of the time steps as seconds since 1970, for a calendar axis.
class StepTimes {
public:
    StepTimes(const GridFile& grid, const TimeAxis& axis, const std::string& path) : grid_(grid), axis_(axis), path_(path) {
        const auto start = parseDateTime(axis.startDate + " " + axis.startTime);
        if (!axis.calendar || axis.unitSeconds <= 0 || !start) {
            throw Failure(path + ": its time axis has no dates (" + std::string(grdTimeAxisTypeStr(axis.type)) +
                          (axis.unitText.empty() ? "" : " in " + axis.unitText) +
                          "): choose time steps by number, e.g. --time 0:4");
        }
        origin_ = *start + axis.start * axis.unitSeconds;
    }

    int64_t count() const { return axis_.timeSteps; }

    double at(int64_t t) {
        if (axis_.equidistant) return origin_ + axis_.stepOffset(t) * axis_.unitSeconds;
        if (times_.empty()) readTimes();
        return origin_ + times_[static_cast<size_t>(t)] * axis_.unitSeconds;
    }

    // The first step at or after when (count() when none).
    int64_t lowerBound(double when) {
        int64_t lo = 0, hi = count();
        while (lo < hi) {
            const int64_t mid = lo + (hi - lo) / 2;
            if (at(mid) < when - kTolerance) {
                lo = mid + 1;
            } else {
                hi = mid;
            }
        }
        return lo;
    }

    std::string text(int64_t t) {
        if (axis_.equidistant) return axis_.text(axis_.stepOffset(t));
        at(t);
        return axis_.text(times_[static_cast<size_t>(t)]);
    }

    static constexpr double kTolerance = 1e-3;  // seconds

private:
    void readTimes() {
        const HeaderHandle h = grid_.header();
        const FileHandle f = grid_.file();
        times_.resize(static_cast<size_t>(count()));
        for (int64_t t = 0; t < count(); ++t) {
            double time = 0;
            int32_t status = grdFindTimeStep(h, f, static_cast<int32_t>(t));
            if (status == F_NO_ERROR) status = grdReadItemTimeStep(h, f, &time, nullptr);
            if (status != F_NO_ERROR) {
                throw Failure(path_ + ": cannot read the time of time step " + std::to_string(t) + ": status " +
                              statusText(status));
            }
            times_[static_cast<size_t>(t)] = time;
        }
    }

    const GridFile& grid_;
    const TimeAxis& axis_;
    std::string path_;
    double origin_ = 0;
    std::vector<double> times_;
};

std::string stepText(StepTimes& times, int64_t t) { return "time step " + std::to_string(t) + " (" + times.text(t) + ")"; }

std::string dateText(double seconds) { return advanceDate("1970-01-01", "00:00:00", seconds); }

StepSpan stepAtDate(StepTimes& times, double when, bool nearest, const std::string& path) {
    const int64_t n = times.count();
    const int64_t after = times.lowerBound(when);
    if (after < n && std::fabs(times.at(after) - when) <= StepTimes::kTolerance) return {after, after};
    if (after == 0 || after == n) {
        throw Failure(path + ": " + dateText(when) + " is " + (after == 0 ? "before the first" : "after the last") +
                      " time step; the time steps run from " + times.text(0) + " to " + times.text(n - 1));
    }
    const int64_t before = after - 1;
    if (nearest) {
        const int64_t t = when - times.at(before) <= times.at(after) - when ? before : after;
        return {t, t};
    }
    throw Failure(path + " has no time step at " + dateText(when) + ": the nearest are " + stepText(times, before) +
                  " and " + stepText(times, after) + "; --nearest takes the closer one");
}

}  // namespace

StepSpan selectSteps(const GridFile& grid, const TimeAxis& axis, const std::optional<std::string>& text, bool nearest,
                     const std::string& path) {
    const int64_t n = axis.timeSteps;
    if (!text) return {0, n - 1};
    if (n <= 0) throw Failure(path + " holds no time steps");
    if (const auto range = parseRange(*text)) {
        const auto outside = [&](int64_t index) {
            return Failure(path + " holds time steps 0 to " + std::to_string(n - 1) + "; time step " +
                           std::to_string(index) + " is not there");
        };
        StepSpan span{0, n - 1};
        if (range->first) {
            const auto first = resolve(*range->first, n);
            if (!first) throw outside(*range->first);
            span.first = *first;
        }
        if (range->last) {
            const auto last = resolve(*range->last, n);
            if (!last) throw outside(*range->last);
            span.last = *last;
        }
        if (span.last < span.first) throw Failure("time steps " + *text + ": the range ends before it begins");
        return span;
    }
    const size_t slash = text->find('/');
    if (slash == std::string::npos) {
        const auto when = parseDateTime(*text);
        if (!when) {
            throw Failure("--time " + *text +
                          ": not a time step, a range A:B or a date (2024-03-22T06:00, or two joined by /)");
        }
        StepTimes times(grid, axis, path);
        return stepAtDate(times, *when, nearest, path);
    }
    const std::string from = text->substr(0, slash);
    const std::string to = text->substr(slash + 1);
    const auto begin = from.empty() ? std::optional<double>(-INFINITY) : parseDateTime(from);
    const auto end = to.empty() ? std::optional<double>(INFINITY) : parseDateTime(to);
    if (!begin || !end) throw Failure("--time " + *text + ": a date range is two dates joined by /");
    StepTimes times(grid, axis, path);
    const StepSpan span{times.lowerBound(*begin), times.lowerBound(*end + 2 * StepTimes::kTolerance) - 1};
    if (span.count() == 0) {
        throw Failure(path + " has no time step from " + (from.empty() ? "the start" : dateText(*begin)) + " to " +
                      (to.empty() ? "the end" : dateText(*end)) + "; the time steps run from " + times.text(0) + " to " +
                      times.text(n - 1));
    }
    return span;
}

Box::Box(const Geometry& g, const std::array<std::optional<std::string>, 3>& axes, const std::string& label) {
    static const char* const kNames[] = {"x", "y", "z"};
    for (int32_t d = 0; d < std::min(g.dims, 4); ++d) size_[d] = std::max(g.size[d], 0);
    if (g.elements == 0) size_[0] = 0;  // an undefined axis holds no values
    for (int d = 0; d < 4; ++d) hi_[d] = size_[d] - 1;
    for (int d = 0; d < 3; ++d) {
        if (!axes[static_cast<size_t>(d)]) continue;
        const std::string& text = *axes[static_cast<size_t>(d)];
        const std::string option = std::string("--") + kNames[d] + " " + text;
        if (d >= g.dims) {
            throw Failure(option + ": " + label + " has no " + kNames[d] + " direction (" + axisName(g.type) +
                          (g.dims == 0 ? ", a single value" : "") + ")");
        }
        const auto range = parseRange(text);
        if (!range) throw Failure(option + ": not an index or a range A:B");
        const auto outside = [&] {
            return Failure(option + ": " + label + " has " + kNames[d] + " indices 0 to " + std::to_string(size_[d] - 1));
        };
        if (range->first) {
            const auto first = resolve(*range->first, size_[d]);
            if (!first) throw outside();
            lo_[d] = *first;
        }
        if (range->last) {
            const auto last = resolve(*range->last, size_[d]);
            if (!last) throw outside();
            hi_[d] = *last;
        }
        if (hi_[d] < lo_[d]) throw Failure(option + ": the range ends before it begins");
        whole_ = whole_ && lo_[d] == 0 && hi_[d] == size_[d] - 1;
    }
}

int64_t Box::count() const {
    int64_t n = 1;
    for (int d = 0; d < 4; ++d) n *= hi_[d] - lo_[d] + 1;
    return n;
}

bool Box::contains(int64_t e) const {
    for (int d = 0; d < 4; ++d) {
        if (size_[d] <= 0) return false;
        const int64_t i = e % size_[d];
        if (i < lo_[d] || i > hi_[d]) return false;
        e /= size_[d];
    }
    return true;
}

}  // namespace tova_cli
