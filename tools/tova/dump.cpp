// `tova dump FILE [--item N] [--step T | --steps A:B] [--static N]
// [--format text|csv] [--limit N]`: the values of a gridded data file, one
// line per element with its grid indices. Time steps are found with the
// library's positioning (a jump, no reading of earlier steps); a single item
// is reached by skipping the items before it. Delete values are shown as
// "delete" in text and as an empty field in CSV.
#include <algorithm>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <vector>

#include "grd_access.h"
#include "grd_commands.h"
#include "tova_cli.h"

namespace tova_cli {

namespace {

constexpr size_t kFlushBytes = 1 << 20;

// Output gathered in large pieces.
class Out {
public:
    ~Out() {
        try {
            flush();
        } catch (const Failure&) {  // a closed output: nothing more to say
        }
    }
    std::string& text() { return text_; }
    void maybeFlush() {
        if (text_.size() >= kFlushBytes) flush();
    }
    void flush() {
        if (text_.empty()) return;
        printOut(text_);
        text_.clear();
    }

private:
    std::string text_;
};

template <class T>
void appendNumber(std::string& out, T value) {
    char buffer[40];
    const auto result = std::to_chars(buffer, buffer + sizeof(buffer), value);
    out.append(buffer, result.ptr);
}

// How one value array is laid out and which values are delete values.
struct Layout {
    int32_t type = 0;
    int32_t dims = 0;
    int64_t nx = 1, ny = 1;
    int64_t elements = 0;
    size_t bytes = 0;
};

class ValueWriter {
public:
    ValueWriter(HeaderHandle h, DumpFormat format, std::optional<int64_t> limit)
        : format_(format), limit_(limit), deleteFloat_(grdGetDeleteValFloat(h)),
          deleteDouble_(grdGetDeleteValDouble(h)), deleteByte_(static_cast<signed char>(grdGetDeleteValByte(h))),
          deleteInt_(grdGetDeleteValInt(h)), deleteUnsigned_(grdGetDeleteValUnsignedInt(h)) {}

    // Writes the values; prefix starts each CSV line.
    void write(Out& out, const Layout& l, const unsigned char* data, const std::string& prefix) {
        const int64_t shown = limit_ ? std::min(*limit_, l.elements) : l.elements;
        std::string& s = out.text();
        if (format_ == DumpFormat::Text) {
            static const char* const kIndex[] = {"i", "j", "k", "l"};
            s += "  ";
            for (int32_t d = 0; d < std::min(l.dims, 3); ++d) s += std::string(8 - std::strlen(kIndex[d]), ' ') + kIndex[d];
            s += "  value\n";
        }
        for (int64_t e = 0; e < shown; ++e) {
            const int64_t idx[3] = {e % l.nx, (e / l.nx) % l.ny, e / (l.nx * l.ny)};
            if (format_ == DumpFormat::Text) {
                s += "  ";
                for (int32_t d = 0; d < std::min(l.dims, 3); ++d) {
                    char cell[24];
                    std::snprintf(cell, sizeof(cell), "%8lld", static_cast<long long>(idx[d]));
                    s += cell;
                }
                s += "  ";
            } else {
                s += prefix;
                appendNumber(s, e);
                for (int32_t d = 0; d < 3; ++d) {
                    s += ',';
                    if (d < l.dims) appendNumber(s, idx[d]);
                }
                s += ',';
            }
            value(s, l.type, data, e);
            s += '\n';
            out.maybeFlush();
        }
        if (format_ == DumpFormat::Text && shown < l.elements) {
            s += "  ... " + std::to_string(l.elements - shown) + " more values\n";
        }
    }

private:
    void deleted(std::string& s) const {
        if (format_ == DumpFormat::Text) s += "delete";
    }

    template <class T>
    static T at(const unsigned char* data, int64_t e) {
        T v;
        std::memcpy(&v, data + static_cast<size_t>(e) * sizeof(T), sizeof(T));
        return v;
    }

    void value(std::string& s, int32_t type, const unsigned char* data, int64_t e) const {
        switch (type) {
        case RCF_FLOAT: {
            const float v = at<float>(data, e);
            if (std::memcmp(&v, &deleteFloat_, sizeof v) == 0) return deleted(s);
            return appendNumber(s, v);
        }
        case RCF_DOUBLE: {
            const double v = at<double>(data, e);
            if (std::memcmp(&v, &deleteDouble_, sizeof v) == 0) return deleted(s);
            return appendNumber(s, v);
        }
        case RCF_BYTE: {
            const auto v = at<signed char>(data, e);
            if (v == deleteByte_) return deleted(s);
            return appendNumber(s, static_cast<int>(v));
        }
        case RCF_INT4: {
            const auto v = at<int32_t>(data, e);
            if (v == deleteInt_) return deleted(s);
            return appendNumber(s, v);
        }
        case RCF_UINT4: {
            const auto v = at<uint32_t>(data, e);
            if (v == deleteUnsigned_) return deleted(s);
            return appendNumber(s, v);
        }
        case RCF_INT2: return appendNumber(s, at<int16_t>(data, e));
        case RCF_UINT2: return appendNumber(s, at<uint16_t>(data, e));
        default: break;
        }
    }

    DumpFormat format_;
    std::optional<int64_t> limit_;
    float deleteFloat_;
    double deleteDouble_;
    signed char deleteByte_;
    int32_t deleteInt_;
    uint32_t deleteUnsigned_;
};

// The layout of an item's values.
Layout layoutOf(ItemHandle item, uint64_t fileSize, const std::string& what) {
    const Geometry g = itemGeometry(item);
    Layout l;
    l.type = itemInfo(item).dataType;
    l.dims = g.dims;
    l.nx = g.dims >= 1 && g.size[0] > 0 ? g.size[0] : 1;
    l.ny = g.dims >= 2 && g.size[1] > 0 ? g.size[1] : 1;
    l.elements = g.elements;
    l.bytes = valueBytes(l.elements, l.type, fileSize, what);
    return l;
}

std::string headerLine(const ItemInfo& info, int32_t n, const Layout& l, const Geometry& g) {
    std::string line = "item " + std::to_string(n) + " \"" + info.name + "\" (" + info.quantityText;
    if (!info.unitText.empty()) line += ", " + info.unitText;
    line += ") " + typeName(l.type) + ", " + axisName(g.type);
    for (int32_t d = 0; d < g.dims; ++d) line += (d == 0 ? " " : " x ") + std::to_string(g.size[d]);
    return line + ", " + std::to_string(l.elements) + (l.elements == 1 ? " value" : " values");
}

void check(int32_t status, const std::string& what) {
    if (status == F_NO_ERROR) return;
    throw Failure(what + ": status " + statusText(status));
}

int dumpStatic(const GridFile& grid, const DumpOptions& options, uint64_t fileSize) {
    const int32_t n = *options.staticItem;
    const int32_t found = grdFindItemStatic(grid.header(), grid.file(), n);
    if (found == F_ERR_ITEM_RANGE) throw Failure(options.file + " has no static item " + std::to_string(n));
    check(found, options.file + ": cannot find static item " + std::to_string(n));
    int32_t status = 0;
    const StaticPtr item = readStatic(grid.file(), &status);
    if (!item) {
        if (status == F_NO_ERROR) throw Failure(options.file + " has no static item " + std::to_string(n));
        check(status, options.file + ": cannot read static item " + std::to_string(n));
    }
    const std::string what = options.file + ": static item " + std::to_string(n);
    const Layout l = layoutOf(item.get(), fileSize, what);
    std::vector<unsigned char> values(std::max<size_t>(l.bytes, 8));
    check(grdStaticGetData(item.get(), values.data()), what);

    Out out;
    ValueWriter writer(grid.header(), options.format, options.limit);
    if (options.format == DumpFormat::Csv) {
        out.text() += "static,element,i,j,k,value\n";
    } else {
        out.text() += "static " + headerLine(itemInfo(item.get()), n, l, itemGeometry(item.get())).substr(5) + "\n";
    }
    writer.write(out, l, values.data(), std::to_string(n) + ",");
    return kExitOk;
}

}  // namespace

int runDump(const DumpOptions& options) {
    const RecordFileInfo file = probeGridFile(options.file);
    const GridFile grid(options.file);
    if (options.staticItem) return dumpStatic(grid, options, file.size);

    const HeaderHandle h = grid.header();
    const FileHandle f = grid.file();
    checkItemNumber(h, options.item, options.file);
    const int32_t items = grdGetNoOfItems(h);
    const TimeAxis axis = timeAxis(h);
    const int64_t steps = axis.timeSteps;
    const StepRange range = options.steps.value_or(StepRange{});
    if (steps == 0) throw Failure(options.file + " holds no time steps");
    const int64_t last = range.last.value_or(steps - 1);
    if (range.first >= steps || last >= steps) {
        throw Failure(options.file + " holds time steps 0 to " + std::to_string(steps - 1) + "; time step " +
                      std::to_string(range.first >= steps ? range.first : last) + " is not there");
    }

    const int32_t firstItem = options.item.value_or(1);
    const int32_t lastItem = options.item.value_or(items);
    std::vector<Layout> layouts(static_cast<size_t>(items) + 1);
    std::vector<std::string> titles(static_cast<size_t>(items) + 1);
    size_t largest = 8;
    for (int32_t n = firstItem; n <= lastItem; ++n) {
        const ItemHandle item = grdItemD(h, n);
        const std::string what = options.file + ": item " + std::to_string(n);
        layouts[static_cast<size_t>(n)] = layoutOf(item, file.size, what);
        titles[static_cast<size_t>(n)] = headerLine(itemInfo(item), n, layouts[static_cast<size_t>(n)], itemGeometry(item));
        largest = std::max(largest, layouts[static_cast<size_t>(n)].bytes);
    }
    std::vector<unsigned char> values(largest);

    Out out;
    ValueWriter writer(h, options.format, options.limit);
    if (options.format == DumpFormat::Csv) out.text() += "step,time,item,element,i,j,k,value\n";
    for (int64_t t = range.first; t <= last; ++t) {
        const auto step = static_cast<int32_t>(t);
        const std::string where = options.file + ": time step " + std::to_string(t);
        // With all items the cursor stands at the next step already; a single
        // item is reached by skipping the items before it.
        if (options.item) {
            check(grdFindItemDynamic(h, f, step, firstItem), where + ", item " + std::to_string(firstItem));
        } else {
            check(grdFindTimeStep(h, f, step), where);
        }
        for (int32_t n = firstItem; n <= lastItem; ++n) {
            double time = 0;
            check(grdReadItemTimeStep(h, f, &time, values.data()), where + ", item " + std::to_string(n));
            const double rel = axis.equidistant ? axis.stepOffset(t) : time;
            if (options.format == DumpFormat::Text) {
                if (t != range.first || n != firstItem) out.text() += '\n';
                out.text() += "time step " + std::to_string(t) + "  " + axis.text(rel) + "  " +
                              titles[static_cast<size_t>(n)] + "\n";
            }
            const std::string prefix = std::to_string(t) + "," + axis.value(rel) + "," + std::to_string(n) + ",";
            writer.write(out, layouts[static_cast<size_t>(n)], values.data(), prefix);
        }
    }
    return kExitOk;
}

}  // namespace tova_cli
