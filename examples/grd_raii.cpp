// The C interface from C++: handles owned by RAII wrappers so that nothing
// leaks on an early return or an exception, and failed statuses turned into
// exceptions that carry the library's text for the code.
//
//   grd_raii [file]      (default raii.grd)
#include <cstdio>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include <qty/qty.h>
#include <tova/grd.h>

namespace tova {

struct Error : std::runtime_error {
    Error(int32_t status, const std::string& what)
        : std::runtime_error(what + ": " + grdGetStatusText(status)), status(status) {}
    int32_t status;
};

inline void check(int32_t status, const char* what) {
    if (status != F_NO_ERROR) throw Error(status, what);
}

// A header: created empty for writing, or taken from an opened file.
class Header {
public:
    Header(FileType type, const char* title, int32_t items, ItemStatsType stats = F_ITEM_STATS_GLOBAL) {
        HeaderHandle made = nullptr;
        check(grdHeaderCreate(type, title, "grd_raii example", 1, items, stats, &made), "creating a header");
        h_.reset(made);
    }
    explicit Header(HeaderHandle adopted) : h_(adopted) {}
    HeaderHandle get() const { return h_.get(); }
    ItemHandle item(int32_t n) const { return grdItemD(h_.get(), n); }

private:
    struct Free {
        void operator()(HeaderHandle h) const { grdHeaderDestroy(&h); }
    };
    std::unique_ptr<std::remove_pointer_t<HeaderHandle>, Free> h_;
};

// An open gridded data file with its header. close() reports the status of
// the final header update; a file still open at destruction (an exception
// was thrown) is closed as well, with the status dropped.
class File {
public:
    static File create(const std::string& path, Header header) {
        FileHandle f = nullptr;
        check(grdFileCreate(path.c_str(), header.get(), &f), "creating a file");
        return File(std::move(header), f);
    }
    static File read(const std::string& path) {
        HeaderHandle h = nullptr;
        FileHandle f = nullptr;
        const int32_t status = grdFileRead(path.c_str(), &h, &f);
        File opened(Header(h), f);  // owns whatever came back, even on failure
        check(status, "reading a file");
        return opened;
    }
    File(File&& other) noexcept : header_(std::move(other.header_)), f_(other.f_) { other.f_ = nullptr; }
    File& operator=(File&&) = delete;
    ~File() {
        if (f_ != nullptr && grdFileClose(header_.get(), &f_) != F_NO_ERROR) rcfFileClose(&f_);
    }
    void close() { check(grdFileClose(header_.get(), &f_), "closing a file"); }

    const Header& header() const { return header_; }
    void write(double time, const float* values) {
        check(grdWriteItemTimeStep(header_.get(), f_, time, values), "writing an item");
    }
    double read(float* values) {
        double time = 0.0;
        check(grdReadItemTimeStep(header_.get(), f_, &time, values), "reading an item");
        return time;
    }
    void seek(int32_t timeStep) { check(grdFindTimeStep(header_.get(), f_, timeStep), "finding a time step"); }

private:
    File(Header header, FileHandle f) : header_(std::move(header)), f_(f) {}
    Header header_;
    FileHandle f_;
};

}  // namespace tova

int main(int argc, char** argv) {
    const std::string path = argc > 1 ? argv[1] : "raii.grd";
    try {
        constexpr int32_t nx = 20, ny = 10, steps = 5;
        int32_t metre = 0;
        if (!qtyGetUnitTag("m", &metre)) throw std::runtime_error("no unit m");

        tova::Header header(F_NEQTIME_FIXEDSPACE_ALLITEMS, "Surge", 1);
        tova::check(grdSetItemInfo(header.get(), header.item(1), QTY_ITEM_UNDEFINED, "Surge", metre, RCF_FLOAT),
                    "item");
        tova::check(grdSetItemAxisEqD2(header.item(1), metre, nx, ny, 0, 0, 100, 100), "grid");
        // A non-equidistant axis: each step carries its own time (hours).
        int32_t hour = 0;
        qtyGetUnitTag("h", &hour);
        tova::check(grdSetNeqTimeAxis(header.get(), hour, 0.0, 0), "time axis");

        std::vector<float> values(nx * ny);
        const double times[steps] = {0.0, 0.5, 1.5, 3.0, 6.0};
        tova::File out = tova::File::create(path, std::move(header));
        for (int32_t t = 0; t < steps; ++t) {
            for (size_t e = 0; e < values.size(); ++e) values[e] = static_cast<float>(times[t] + 0.001 * e);
            out.write(times[t], values.data());
        }
        out.close();

        tova::File in = tova::File::read(path);
        in.seek(3);
        const double time = in.read(values.data());
        std::printf("grd_raii: %s: time step 3 at %g h, first value %g\n", path.c_str(), time, values[0]);
        if (time != 3.0 || values[0] != 3.0f) return 1;

        // A failure is an exception with the library's text (the position
        // after the last step exists; the one after it does not).
        try {
            in.seek(steps + 1);
            return 1;
        } catch (const tova::Error& e) {
            std::printf("grd_raii: as expected, %s\n", e.what());
        }
    } catch (const std::exception& e) {
        std::fprintf(stderr, "grd_raii: %s\n", e.what());
        return 1;
    }
    return 0;
}
