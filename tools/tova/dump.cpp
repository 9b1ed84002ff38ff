// `tova dump FILE [--item ITEM]... [--time WHEN [--nearest]] [--x A:B] [--y
// A:B] [--z A:B] [--static ITEM] [--format text|csv] [--limit N]`: the values
// of a gridded data file, one line per element with its grid indices. Time
// steps are found with the library's positioning (a jump, no reading of
// earlier steps); an item is reached by skipping the items before it.
// Delete values are shown as "delete" in text and as an empty field in CSV.
// A file that turns out damaged on the way ends with what `check` says.
#include <algorithm>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <vector>

#include "grd_access.h"
#include "grd_commands.h"
#include "progress.h"
#include "selection.h"
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

    // Writes the values of the cells in box; prefix starts each CSV line.
    void write(Out& out, const Layout& l, const Box& box, const unsigned char* data, const std::string& prefix) {
        const int64_t total = box.count();
        const int64_t shown = limit_ ? std::min(*limit_, total) : total;
        std::string& s = out.text();
        if (format_ == DumpFormat::Text) {
            static const char* const kIndex[] = {"i", "j", "k", "l"};
            s += "  ";
            for (int32_t d = 0; d < std::min(l.dims, 3); ++d) s += std::string(8 - std::strlen(kIndex[d]), ' ') + kIndex[d];
            s += "  value\n";
        }
        int64_t written = 0;
        box.forEachRun([&](int64_t first, int64_t length) {
            for (int64_t e = first; e < first + length && written < shown; ++e, ++written) line(out, l, data, e, prefix);
        });
        if (format_ == DumpFormat::Text && shown < total) {
            s += "  ... " + std::to_string(total - shown) + " more values\n";
        }
    }

private:
    void line(Out& out, const Layout& l, const unsigned char* data, int64_t e, const std::string& prefix) {
        std::string& s = out.text();
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

std::string itemLabel(const char* what, int32_t n, const std::string& name) {
    return std::string(what) + " " + std::to_string(n) + " \"" + name + "\"";
}

// The names of the static items after the encoding keys; the file is left
// positioned at the first of them.
std::vector<std::string> staticNames(const GridFile& grid, const std::string& path) {
    std::vector<std::string> names;
    check(grdFindBlockStatic(grid.header(), grid.file()), path + ": cannot find the static items");
    for (;;) {
        int32_t status = 0;
        const StaticPtr item = readStatic(grid.file(), &status);
        if (!item) {
            check(status, path + ": static item " + std::to_string(names.size() + 1));
            return names;
        }
        names.push_back(itemInfo(item.get()).name);
    }
}

int dumpStatic(const GridFile& grid, const DumpOptions& options, uint64_t fileSize) {
    const int32_t n = findByName(staticNames(grid, options.file), *options.staticItem, "static item", options.file);
    check(grdFindItemStatic(grid.header(), grid.file(), n), options.file + ": cannot find static item " + std::to_string(n));
    int32_t status = 0;
    const StaticPtr item = readStatic(grid.file(), &status);
    if (!item) {
        if (status == F_NO_ERROR) throw Failure(options.file + " has no static item " + std::to_string(n));
        check(status, options.file + ": cannot read static item " + std::to_string(n));
    }
    const std::string what = options.file + ": static item " + std::to_string(n);
    const Layout l = layoutOf(item.get(), fileSize, what);
    const Box box(itemGeometry(item.get()), options.select.axes, itemLabel("static item", n, itemInfo(item.get()).name));
    std::vector<unsigned char> values(std::max<size_t>(l.bytes, 8));
    check(grdStaticGetData(item.get(), values.data()), what);

    Out out;
    ValueWriter writer(grid.header(), options.format, options.limit);
    if (options.format == DumpFormat::Csv) {
        out.text() += "static,element,i,j,k,value\n";
    } else {
        out.text() += "static " + headerLine(itemInfo(item.get()), n, l, itemGeometry(item.get())).substr(5) + "\n";
    }
    writer.write(out, l, box, values.data(), std::to_string(n) + ",");
    return kExitOk;
}

// One selected item: how its values lie, which cells are shown, its title.
struct Shown {
    int32_t number = 0;
    Layout layout;
    Box box;
    std::string title;
};

}  // namespace

int runDump(const DumpOptions& options) {
    const RecordFileInfo file = probeGridFile(options.file);
    int32_t opened = 0;
    const GridFile grid(options.file, &opened);
    if (opened != F_NO_ERROR) {
        return reportDamage(options.file, options.file + ": the gridded data-file reader refuses the file: status " +
                                              statusText(opened));
    }
    if (options.staticItem) {
        try {
            return dumpStatic(grid, options, file.size);
        } catch (const Failure& e) {
            return reportDamage(options.file, e.what());
        }
    }

    const HeaderHandle h = grid.header();
    const FileHandle f = grid.file();
    const TimeAxis axis = timeAxis(h);
    const StepSpan steps = selectSteps(grid, axis, options.select.time, options.select.nearest, options.file);
    if (steps.count() == 0) throw Failure(options.file + " holds no time steps");
    std::vector<Shown> shown;
    size_t largest = 8;
    for (const int32_t n : selectItems(h, options.select.items, options.file)) {
        const ItemHandle item = grdItemD(h, n);
        const ItemInfo info = itemInfo(item);
        const Geometry g = itemGeometry(item);
        const Layout l = layoutOf(item, file.size, options.file + ": item " + std::to_string(n));
        shown.push_back(Shown{n, l, Box(g, options.select.axes, itemLabel("item", n, info.name)), headerLine(info, n, l, g)});
        largest = std::max(largest, l.bytes);
    }
    std::vector<unsigned char> values(largest);

    Out out;
    ValueWriter writer(h, options.format, options.limit);
    Progress progress("dumping", file.size, 64ull << 20, true);
    if (options.format == DumpFormat::Csv) out.text() += "step,time,item,element,i,j,k,value\n";
    try {
        for (int64_t t = steps.first; t <= steps.last; ++t) {
            const auto step = static_cast<int32_t>(t);
            const std::string where = options.file + ": time step " + std::to_string(t);
            for (const Shown& item : shown) {
                const std::string what = where + ", item " + std::to_string(item.number);
                // The cursor stands at the next item already when items follow in file order.
                check(grdFindItemDynamic(h, f, step, item.number), what);
                double time = 0;
                check(grdReadItemTimeStep(h, f, &time, values.data()), what);
                progress.update(static_cast<uint64_t>(std::max<int64_t>(rcfTell64(f), 0)));
                const double rel = axis.equidistant ? axis.stepOffset(t) : time;
                if (options.format == DumpFormat::Text) {
                    if (t != steps.first || &item != &shown.front()) out.text() += '\n';
                    out.text() += "time step " + std::to_string(t) + "  " + axis.text(rel) + "  " + item.title + "\n";
                }
                const std::string prefix = std::to_string(t) + "," + axis.value(rel) + "," + std::to_string(item.number) + ",";
                writer.write(out, item.layout, item.box, values.data(), prefix);
            }
        }
    } catch (const Failure& e) {
        out.flush();
        return reportDamage(options.file, e.what());
    }
    return kExitOk;
}

}  // namespace tova_cli
