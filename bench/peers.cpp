// Side-by-side benchmark of the gridded data files against their peers: raw
// stdio (fwrite/fread of the same bytes, the limit), netCDF-C in the classic
// 64-bit-offset format and netCDF-4 (HDF5) with an unlimited time dimension.
// Every contender writes and reads time step by time step, item by item, as a
// model engine does. Eight workloads; each timing is the median of repeats;
// files live in one folder under the build tree and are deleted as soon as
// they are measured (dirty pages of a deleted file are never written back, so
// the disk does not throttle the next run). Results go to standard output as
// Markdown; progress to standard error.
#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <functional>
#include <latch>
#include <memory>
#include <mutex>
#include <numeric>
#include <random>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include <dlfcn.h>
#include <netcdf.h>

#include "qty/qty.h"
#include "tova/grd.h"

namespace {

namespace fs = std::filesystem;

// Seconds on the chosen clock: process CPU time (user and system, the
// default: on a shared machine, waiting for a processor is nobody's cost;
// copies to and from the page cache are system time) or wall time. The
// thread workload always measures wall time; the large grids measure both.
struct Clock {
    using time_point = double;
    static inline bool wall = false;
    static double now() {
        timespec t{};
        clock_gettime(wall ? CLOCK_MONOTONIC : CLOCK_PROCESS_CPUTIME_ID, &t);
        return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
    }
};
double since(Clock::time_point t0) { return Clock::now() - t0; }

double threadCpuNow() {
    timespec t{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &t);
    return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
}

double wallNow() {
    timespec t{};
    clock_gettime(CLOCK_MONOTONIC, &t);
    return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
}

double processCpuNow() {
    timespec t{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &t);
    return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
}

// Both clocks over one piece of work: the wall-clock time is what a writer
// waits for (throughput), the process CPU time what the work costs (all
// threads, the library's helper thread among them).
struct Timing {
    double wall = NAN, cpu = NAN;
    double chosen() const { return Clock::wall ? wall : cpu; }
};
struct Stopwatch {
    double wall0 = wallNow(), cpu0 = processCpuNow();
    Timing elapsed() const { return {wallNow() - wall0, processCpuNow() - cpu0}; }
};

[[noreturn]] void fail(const std::string& what) { throw std::runtime_error(what); }

// ---- Options ------------------------------------------------------------------------------

struct Options {
    int repeats = 5;
    // The large grids write into fresh page-cache memory, whose cost on a
    // virtual machine jumps from round to round (first touches of guest
    // memory): more rounds give a steadier median.
    int gridRepeats = 11;
    std::string dir = "bench-data";
    std::vector<int> only;                    // workloads to run; empty: all
    std::vector<std::string> contenders = {"raw", "tova", "nc3", "nc4"};
    bool verify = false;                      // check every value read
    double budget = 2.0;                      // seconds a timed loop of small reads may take at most
    int gridN = 1000, gridItems = 3, gridSteps = 100;
    int seriesItems = 500, seriesSteps = 20000, seriesStepsNc4 = 20;
    int randomSteps = 10000, randomReads = 20000, randomProbes = 200;
    int openItems = 2000, openRepeats = 50;
    double compFraction = 0.3;
    int compSteps = 100;
    int threadSteps = 25;
    std::vector<int> threads = {1, 2, 4};
    std::vector<int> scaleSteps = {10, 100, 1000};
    std::vector<int> scaleItems = {10, 100, 1000, 10000};
    int nc4OpenMax = 2000;  // netCDF-4 opens of more items are skipped (they take minutes)
    int wideItems = 10000, wideSteps = 50, wideReads = 2000;

    void smoke() {
        repeats = 1;
        gridRepeats = 1;
        verify = true;
        gridN = 64, gridItems = 3, gridSteps = 4;
        seriesItems = 20, seriesSteps = 60, seriesStepsNc4 = 30;
        budget = 0.05;
        randomSteps = 60, randomReads = 100, randomProbes = 5;
        openItems = 50, openRepeats = 3;
        compSteps = 3;
        threadSteps = 2;
        scaleSteps = {2, 4, 8};
        scaleItems = {5, 10, 20};
        wideItems = 200, wideSteps = 5, wideReads = 20;
    }
    bool runs(int w) const { return only.empty() || std::find(only.begin(), only.end(), w) != only.end(); }
};

std::vector<int> intList(const std::string& text) {
    std::vector<int> out;
    std::stringstream in(text);
    for (std::string part; std::getline(in, part, ',');) out.push_back(std::stoi(part));
    return out;
}

std::vector<std::string> textList(const std::string& text) {
    std::vector<std::string> out;
    std::stringstream in(text);
    for (std::string part; std::getline(in, part, ',');) out.push_back(part);
    return out;
}

const char* kUsage =
    "usage: peers [--smoke] [--repeats=N] [--grid-repeats=N] [--dir=PATH] [--only=1,2,...] [--contenders=raw,tova,nc3,nc4]\n"
    "             [--verify] [--clock=cpu|wall] [--budget=SECONDS] [--grid=N] [--grid-items=N] [--grid-steps=N] [--series-items=N]\n"
    "             [--series-steps=N] [--series-steps-nc4=N] [--random-steps=N] [--random-reads=N]\n"
    "             [--random-probes=N] [--open-items=N] [--open-repeats=N] [--comp-fraction=F]\n"
    "             [--comp-steps=N] [--thread-steps=N] [--threads=1,2,4] [--scale-steps=10,100,1000]\n"
    "             [--scale-items=10,100,1000,10000] [--nc4-open-max=N] [--wide-items=N] [--wide-steps=N]\n"
    "             [--wide-reads=N]\n";

Options parseOptions(int argc, char** argv) {
    Options o;
    for (int i = 1; i < argc; ++i)
        if (std::strcmp(argv[i], "--smoke") == 0) o.smoke();  // first, so that later options override it
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        const auto eq = arg.find('=');
        const std::string key = arg.substr(0, eq);
        const std::string value = eq == std::string::npos ? "" : arg.substr(eq + 1);
        auto num = [&] { return std::stoi(value); };
        if (key == "--smoke") continue;
        else if (key == "--verify") o.verify = true;
        else if (key == "--clock" && (value == "wall" || value == "cpu")) Clock::wall = value == "wall";
        else if (key == "--budget") o.budget = std::stod(value);
        else if (key == "--repeats") o.repeats = std::max(1, num());
        else if (key == "--grid-repeats") o.gridRepeats = std::max(1, num());
        else if (key == "--dir") o.dir = value;
        else if (key == "--only") o.only = intList(value);
        else if (key == "--contenders") o.contenders = textList(value);
        else if (key == "--grid") o.gridN = num();
        else if (key == "--grid-items") o.gridItems = num();
        else if (key == "--grid-steps") o.gridSteps = num();
        else if (key == "--series-items") o.seriesItems = num();
        else if (key == "--series-steps") o.seriesSteps = num();
        else if (key == "--series-steps-nc4") o.seriesStepsNc4 = num();
        else if (key == "--random-steps") o.randomSteps = num();
        else if (key == "--random-reads") o.randomReads = num();
        else if (key == "--random-probes") o.randomProbes = num();
        else if (key == "--open-items") o.openItems = num();
        else if (key == "--open-repeats") o.openRepeats = num();
        else if (key == "--comp-fraction") o.compFraction = std::stod(value);
        else if (key == "--comp-steps") o.compSteps = num();
        else if (key == "--thread-steps") o.threadSteps = num();
        else if (key == "--threads") o.threads = intList(value);
        else if (key == "--scale-steps") o.scaleSteps = intList(value);
        else if (key == "--scale-items") o.scaleItems = intList(value);
        else if (key == "--nc4-open-max") o.nc4OpenMax = num();
        else if (key == "--wide-items") o.wideItems = num();
        else if (key == "--wide-steps") o.wideSteps = num();
        else if (key == "--wide-reads") o.wideReads = num();
        else {
            std::fputs(kUsage, stderr);
            std::exit(2);
        }
    }
    return o;
}

// ---- Data sets ----------------------------------------------------------------------------

enum class Elem { Float, Double };

// The shape of one file: items of one element type, scalars (dims 0) or
// grids of nx * ny, optionally stored only at the cells of an encoding key.
struct Shape {
    int items = 1;
    int dims = 2;
    int nx = 1, ny = 1;
    Elem elem = Elem::Float;
    int steps = 1;
    int statsType = F_ITEM_STATS_GLOBAL;
    const std::vector<int32_t>* keyX = nullptr;  // compressed: x and y of each stored cell
    const std::vector<int32_t>* keyY = nullptr;

    bool compressed() const { return keyX != nullptr; }
    int64_t cells() const { return dims == 0 ? 1 : int64_t{nx} * ny; }
    int64_t stored() const { return compressed() ? static_cast<int64_t>(keyX->size()) : cells(); }
    size_t elemSize() const { return elem == Elem::Float ? 4 : 8; }
    size_t storedBytes() const { return static_cast<size_t>(stored()) * elemSize(); }
    double totalBytes() const { return double(storedBytes()) * items * steps; }
    double itemSteps() const { return double(items) * steps; }
};

std::string itemName(int item) {
    char name[32];
    std::snprintf(name, sizeof name, "item%05d", item + 1);
    return name;
}

// Gathering and scattering the stored cells of a compressed grid: what a
// user of raw stdio or netCDF writes by hand (tova does it inside).
template <class T>
void gatherCells(const Shape& s, const T* full, T* packed) {
    const int32_t* x = s.keyX->data();
    const int32_t* y = s.keyY->data();
    const int64_t n = s.stored();
    for (int64_t i = 0; i < n; ++i) packed[i] = full[int64_t{y[i]} * s.nx + x[i]];
}

template <class T>
void scatterCells(const Shape& s, const T* packed, T* full, T fill) {
    const int32_t* x = s.keyX->data();
    const int32_t* y = s.keyY->data();
    const int64_t n = s.stored();
    std::fill(full, full + s.cells(), fill);
    for (int64_t i = 0; i < n; ++i) full[int64_t{y[i]} * s.nx + x[i]] = packed[i];
}

void gather(const Shape& s, const void* full, void* packed) {
    if (s.elem == Elem::Float) gatherCells(s, static_cast<const float*>(full), static_cast<float*>(packed));
    else gatherCells(s, static_cast<const double*>(full), static_cast<double*>(packed));
}

void scatter(const Shape& s, const void* packed, void* full) {
    if (s.elem == Elem::Float)
        scatterCells(s, static_cast<const float*>(packed), static_cast<float*>(full), F_DELETE_VALUE_FLOAT);
    else
        scatterCells(s, static_cast<const double*>(packed), static_cast<double*>(full), F_DELETE_VALUE_DOUBLE);
}

// ---- Contenders ---------------------------------------------------------------------------

// One way of storing a shape. Writes and sequential reads come in file order
// (time step after time step, items in order); readAt may jump anywhere.
// Arrays are always the full grid; compressed shapes store only the key's
// cells.
class Contender {
public:
    virtual ~Contender() = default;
    virtual void create(const std::string& path, const Shape& s) = 0;
    virtual void write(int step, int item, const void* full) = 0;
    virtual void finish() = 0;  // closes after writing
    virtual void open(const std::string& path, const Shape& s) = 0;
    virtual void read(int step, int item, void* full) = 0;
    virtual void readAt(int step, int item, void* full) = 0;
    virtual void close() = 0;
    // Opens a file, learns every item's name, type and size, closes it;
    // returns the number of items.
    virtual int inspect(const std::string& path) = 0;
    // Writes all time steps of scalar item `item` in one call, where the
    // format allows it (only to prepare files quickly; never timed).
    virtual bool writeColumn(int /*item*/, const double* /*values*/) { return false; }
};

// Raw stdio: a small fixed-size item table, the encoding keys when
// compressed, then the values time step by time step, nothing else. Plain
// streams with the C library's own buffer: large transfers bypass it, and a
// larger one would only make every positioned read refill more of it.
class RawContender final : public Contender {
    struct Preamble {
        char magic[8];
        int32_t items, steps, keyLength, reserved;
    };
    struct Entry {  // 64 bytes per item
        char name[40];
        int32_t elem, dims, nx, ny;
        char unit[8];
    };
    std::FILE* f_ = nullptr;
    Shape s_;
    int64_t dataStart_ = 0;
    std::vector<unsigned char> packed_;
    std::vector<int32_t> keyX_, keyY_;

    std::FILE* openStream(const std::string& path, const char* mode) {
        std::FILE* f = std::fopen(path.c_str(), mode);
        if (f == nullptr) fail("raw: cannot open " + path);
        return f;
    }
    void put(const void* p, size_t n) {
        if (std::fwrite(p, 1, n, f_) != n) fail("raw: write failed");
    }
    void get(void* p, size_t n) {
        if (std::fread(p, 1, n, f_) != n) fail("raw: read failed");
    }
    // Reads the preamble and the item table; returns the item count.
    int readTable(std::vector<Entry>& entries, Preamble& p) {
        get(&p, sizeof p);
        if (std::memcmp(p.magic, "RAWBENCH", 8) != 0 || p.items < 0) fail("raw: not a raw bench file");
        entries.resize(static_cast<size_t>(p.items));
        get(entries.data(), entries.size() * sizeof(Entry));
        return p.items;
    }

public:
    void create(const std::string& path, const Shape& s) override {
        s_ = s;
        f_ = openStream(path, "wb");
        Preamble p{{'R', 'A', 'W', 'B', 'E', 'N', 'C', 'H'}, s.items, s.steps,
                   s.compressed() ? static_cast<int32_t>(s.stored()) : 0, 0};
        put(&p, sizeof p);
        std::vector<Entry> entries(static_cast<size_t>(s.items));
        for (int i = 0; i < s.items; ++i) {
            Entry& e = entries[static_cast<size_t>(i)];
            std::memset(&e, 0, sizeof e);
            std::snprintf(e.name, sizeof e.name, "%s", itemName(i).c_str());
            e.elem = s.elem == Elem::Float ? 1 : 2;
            e.dims = s.dims, e.nx = s.nx, e.ny = s.ny;
            std::memcpy(e.unit, "m", 2);
        }
        put(entries.data(), entries.size() * sizeof(Entry));
        if (s.compressed()) {
            put(s.keyX->data(), s.keyX->size() * 4);
            put(s.keyY->data(), s.keyY->size() * 4);
            packed_.resize(s.storedBytes());
        }
    }
    void write(int, int, const void* full) override {
        if (!s_.compressed()) return put(full, s_.storedBytes());
        gather(s_, full, packed_.data());
        put(packed_.data(), packed_.size());
    }
    void finish() override { close(); }
    void open(const std::string& path, const Shape& s) override {
        s_ = s;
        f_ = openStream(path, "rb");
        std::vector<Entry> entries;
        Preamble p;
        readTable(entries, p);
        if (p.items != s.items) fail("raw: unexpected item count");
        if (p.keyLength > 0) {
            keyX_.resize(static_cast<size_t>(p.keyLength));
            keyY_.resize(static_cast<size_t>(p.keyLength));
            get(keyX_.data(), keyX_.size() * 4);
            get(keyY_.data(), keyY_.size() * 4);
            s_.keyX = &keyX_;
            s_.keyY = &keyY_;
            packed_.resize(s_.storedBytes());
        }
        dataStart_ = static_cast<int64_t>(sizeof p + entries.size() * sizeof(Entry)) + int64_t{p.keyLength} * 8;
    }
    void read(int, int, void* full) override {
        if (!s_.compressed()) return get(full, s_.storedBytes());
        get(packed_.data(), packed_.size());
        scatter(s_, packed_.data(), full);
    }
    void readAt(int step, int item, void* full) override {
        const auto bytes = static_cast<int64_t>(s_.storedBytes());
        if (fseeko(f_, dataStart_ + (int64_t{step} * s_.items + item) * bytes, SEEK_SET) != 0) fail("raw: seek");
        read(step, item, full);
    }
    void close() override {
        if (f_ != nullptr && std::fclose(f_) != 0) fail("raw: close failed");
        f_ = nullptr;
    }
    int inspect(const std::string& path) override {
        f_ = openStream(path, "rb");
        std::vector<Entry> entries;
        Preamble p;
        const int n = readTable(entries, p);
        close();
        return n;
    }
};

void tv(int32_t status, const char* what) {
    if (status != 0) fail(std::string("tova: ") + what + " returned " + std::to_string(status));
}

// tova: one gridded data file of type 1 (equidistant time, fixed space).
class TovaContender final : public Contender {
    HeaderHandle h_ = nullptr;
    FileHandle f_ = nullptr;

public:
    ~TovaContender() override {
        if (f_ != nullptr) grdFileClose(h_, &f_);
        if (h_ != nullptr) grdHeaderDestroy(&h_);
    }
    void create(const std::string& path, const Shape& s) override {
        tv(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "benchmark", "tova peers", 1, s.items, s.statsType, &h_),
           "grdHeaderCreate");
        const int32_t dataType = s.elem == Elem::Float ? 1 : 2;
        for (int i = 0; i < s.items; ++i) {
            ItemHandle item = grdItemD(h_, i + 1);
            tv(grdSetItemInfo(h_, item, QTY_ITEM_UNDEFINED, itemName(i).c_str(), QTY_UNIT_UNDEFINED, dataType),
               "grdSetItemInfo");
            if (s.dims == 2)
                tv(grdSetItemAxisEqD2(item, QTY_UNIT_UNDEFINED, s.nx, s.ny, 0.0f, 0.0f, 1.0f, 1.0f),
                   "grdSetItemAxisEqD2");
        }
        tv(grdSetEqTimeAxis(h_, QTY_UNIT_SECOND, 0.0, 60.0, 0), "grdSetEqTimeAxis");
        if (s.compressed())
            tv(grdSetEncodeKey(h_, s.keyX->data(), s.keyY->data(), nullptr, static_cast<int32_t>(s.stored())),
               "grdSetEncodeKey");
        tv(grdFileCreate(path.c_str(), h_, &f_), "grdFileCreate");
    }
    void write(int step, int, const void* full) override {
        tv(grdWriteItemTimeStep(h_, f_, step * 60.0, full), "grdWriteItemTimeStep");
    }
    void finish() override { close(); }
    void open(const std::string& path, const Shape&) override {
        tv(grdFileRead(path.c_str(), &h_, &f_), "grdFileRead");
    }
    void read(int, int, void* full) override {
        double time = 0;
        tv(grdReadItemTimeStep(h_, f_, &time, full), "grdReadItemTimeStep");
    }
    void readAt(int step, int item, void* full) override {
        tv(grdFindItemDynamic(h_, f_, step, item + 1), "grdFindItemDynamic");
        read(step, item, full);
    }
    void close() override {
        if (f_ != nullptr) tv(grdFileClose(h_, &f_), "grdFileClose");
        if (h_ != nullptr) tv(grdHeaderDestroy(&h_), "grdHeaderDestroy");
    }
    int inspect(const std::string& path) override {
        tv(grdFileRead(path.c_str(), &h_, &f_), "grdFileRead");
        const int n = grdGetNoOfItems(h_);
        for (int i = 1; i <= n; ++i) {
            ItemHandle item = grdItemD(h_, i);
            int32_t type = 0, unit = 0, dataType = 0;
            const char *typeText = nullptr, *name = nullptr, *unitText = nullptr;
            tv(grdGetItemInfo(item, &type, &typeText, &name, &unit, &unitText, &dataType), "grdGetItemInfo");
            if (name == nullptr || grdGetItemElements(item) < 1) fail("tova: item without name or elements");
        }
        close();
        return n;
    }
};

void nc(int status, const char* what) {
    if (status != NC_NOERR) fail(std::string("netCDF: ") + what + ": " + nc_strerror(status));
}

// netCDF-C: one variable per item over (time, y, x), (time, cell) when
// compressed by gathering, or (time) for scalars; time is the unlimited
// dimension. No fill (a model engine that cares for speed turns it off);
// default chunking and caches. netCDF-C and HDF5 are not thread-safe: with a
// lock every call holds it.
class NetcdfContender final : public Contender {
    int mode_;
    std::mutex* lock_;
    int ncid_ = -1;
    Shape s_;
    std::vector<int> var_;
    std::vector<unsigned char> packed_;
    std::vector<int32_t> keyX_, keyY_;

    std::unique_lock<std::mutex> guard() { return lock_ ? std::unique_lock(*lock_) : std::unique_lock<std::mutex>(); }
    int rank() const { return s_.dims == 0 ? 1 : s_.compressed() ? 2 : 3; }
    void region(int step, size_t start[3], size_t count[3]) const {
        start[0] = static_cast<size_t>(step), count[0] = 1;
        start[1] = start[2] = 0;
        if (s_.compressed()) {
            count[1] = static_cast<size_t>(s_.stored());
        } else {
            count[1] = static_cast<size_t>(s_.ny);
            count[2] = static_cast<size_t>(s_.nx);
        }
    }

public:
    NetcdfContender(int mode, std::mutex* lock) : mode_(mode), lock_(lock) {}
    ~NetcdfContender() override {
        if (ncid_ >= 0) nc_close(ncid_);
    }
    void create(const std::string& path, const Shape& s) override {
        s_ = s;
        auto g = guard();
        nc(nc_create(path.c_str(), NC_CLOBBER | mode_, &ncid_), "nc_create");
        int old = 0;
        nc(nc_set_fill(ncid_, NC_NOFILL, &old), "nc_set_fill");
        nc(nc_put_att_text(ncid_, NC_GLOBAL, "title", 9, "benchmark"), "nc_put_att_text");
        int dims[3] = {};
        nc(nc_def_dim(ncid_, "time", NC_UNLIMITED, &dims[0]), "nc_def_dim");
        int keyVars[2] = {};
        if (s.compressed()) {
            nc(nc_def_dim(ncid_, "cell", static_cast<size_t>(s.stored()), &dims[1]), "nc_def_dim");
            nc(nc_def_var(ncid_, "cell_x", NC_INT, 1, &dims[1], &keyVars[0]), "nc_def_var");
            nc(nc_def_var(ncid_, "cell_y", NC_INT, 1, &dims[1], &keyVars[1]), "nc_def_var");
            packed_.resize(s.storedBytes());
        } else if (s.dims == 2) {
            nc(nc_def_dim(ncid_, "y", static_cast<size_t>(s.ny), &dims[1]), "nc_def_dim");
            nc(nc_def_dim(ncid_, "x", static_cast<size_t>(s.nx), &dims[2]), "nc_def_dim");
        }
        var_.resize(static_cast<size_t>(s.items));
        const nc_type type = s.elem == Elem::Float ? NC_FLOAT : NC_DOUBLE;
        for (int i = 0; i < s.items; ++i) {
            int& v = var_[static_cast<size_t>(i)];
            nc(nc_def_var(ncid_, itemName(i).c_str(), type, rank(), dims, &v), "nc_def_var");
            nc(nc_put_att_text(ncid_, v, "units", 1, "m"), "nc_put_att_text");
        }
        nc(nc_enddef(ncid_), "nc_enddef");
        if (s.compressed()) {
            nc(nc_put_var_int(ncid_, keyVars[0], s.keyX->data()), "nc_put_var_int");
            nc(nc_put_var_int(ncid_, keyVars[1], s.keyY->data()), "nc_put_var_int");
        }
    }
    void write(int step, int item, const void* full) override {
        size_t start[3], count[3];
        region(step, start, count);
        const void* p = full;
        if (s_.compressed()) {
            gather(s_, full, packed_.data());
            p = packed_.data();
        }
        auto g = guard();
        const int v = var_[static_cast<size_t>(item)];
        if (s_.elem == Elem::Float) nc(nc_put_vara_float(ncid_, v, start, count, static_cast<const float*>(p)), "put");
        else nc(nc_put_vara_double(ncid_, v, start, count, static_cast<const double*>(p)), "put");
    }
    void finish() override { close(); }
    void open(const std::string& path, const Shape& s) override {
        s_ = s;
        auto g = guard();
        nc(nc_open(path.c_str(), NC_NOWRITE, &ncid_), "nc_open");
        var_.resize(static_cast<size_t>(s.items));
        for (int i = 0; i < s.items; ++i)
            nc(nc_inq_varid(ncid_, itemName(i).c_str(), &var_[static_cast<size_t>(i)]), "nc_inq_varid");
        if (s.compressed()) {
            const auto n = static_cast<size_t>(s.stored());
            keyX_.resize(n), keyY_.resize(n);
            int vx = 0, vy = 0;
            nc(nc_inq_varid(ncid_, "cell_x", &vx), "nc_inq_varid");
            nc(nc_inq_varid(ncid_, "cell_y", &vy), "nc_inq_varid");
            nc(nc_get_var_int(ncid_, vx, keyX_.data()), "nc_get_var_int");
            nc(nc_get_var_int(ncid_, vy, keyY_.data()), "nc_get_var_int");
            s_.keyX = &keyX_, s_.keyY = &keyY_;
            packed_.resize(s_.storedBytes());
        }
    }
    void read(int step, int item, void* full) override {
        size_t start[3], count[3];
        region(step, start, count);
        void* p = s_.compressed() ? packed_.data() : full;
        {
            auto g = guard();
            const int v = var_[static_cast<size_t>(item)];
            if (s_.elem == Elem::Float) nc(nc_get_vara_float(ncid_, v, start, count, static_cast<float*>(p)), "get");
            else nc(nc_get_vara_double(ncid_, v, start, count, static_cast<double*>(p)), "get");
        }
        if (s_.compressed()) scatter(s_, packed_.data(), full);
    }
    void readAt(int step, int item, void* full) override { read(step, item, full); }
    bool writeColumn(int item, const double* values) override {
        const size_t start = 0, count = static_cast<size_t>(s_.steps);
        auto g = guard();
        nc(nc_put_vara_double(ncid_, var_[static_cast<size_t>(item)], &start, &count, values), "put");
        return true;
    }
    void close() override {
        if (ncid_ < 0) return;
        auto g = guard();
        const int status = nc_close(ncid_);
        ncid_ = -1;
        nc(status, "nc_close");
    }
    int inspect(const std::string& path) override {
        auto g = guard();
        int id = -1;
        nc(nc_open(path.c_str(), NC_NOWRITE, &id), "nc_open");
        int nvars = 0;
        nc(nc_inq_nvars(id, &nvars), "nc_inq_nvars");
        for (int v = 0; v < nvars; ++v) {
            char name[NC_MAX_NAME + 1];
            nc_type type;
            int ndims = 0, dims[NC_MAX_VAR_DIMS], natts = 0;
            nc(nc_inq_var(id, v, name, &type, &ndims, dims, &natts), "nc_inq_var");
            size_t elements = 1;
            for (int d = 0; d < ndims; ++d) {
                size_t len = 0;
                nc(nc_inq_dimlen(id, dims[d], &len), "nc_inq_dimlen");
                if (d > 0) elements *= len;
            }
            size_t unitLength = 0;
            nc(nc_inq_attlen(id, v, "units", &unitLength), "nc_inq_attlen");
            char unit[NC_MAX_NAME + 1] = {};
            if (unitLength < sizeof unit) nc(nc_get_att_text(id, v, "units", unit), "nc_get_att_text");
            if (elements < 1) fail("netCDF: variable without elements");
        }
        nc(nc_close(id), "nc_close");
        return nvars;
    }
    // The chunk shape netCDF-4 chose for the first item's variable, as
    // "1 x 1000 x 1000".
    static std::string chunking(const std::string& path) {
        int id = -1, var = 0, storage = 0;
        size_t chunks[3] = {};
        nc(nc_open(path.c_str(), NC_NOWRITE, &id), "nc_open");
        nc(nc_inq_varid(id, itemName(0).c_str(), &var), "nc_inq_varid");
        int ndims = 0;
        nc(nc_inq_varndims(id, var, &ndims), "nc_inq_varndims");
        nc(nc_inq_var_chunking(id, var, &storage, chunks), "nc_inq_var_chunking");
        nc_close(id);
        std::string out;
        for (int d = 0; d < ndims && d < 3; ++d) out += (d ? " x " : "") + std::to_string(chunks[d]);
        return storage == NC_CHUNKED ? out : "contiguous";
    }
};

// HDF5 prints its error stack for every failed call unless told not to, per
// thread; netCDF-4 tells it so only in the thread that first opened a file,
// and probes optional attributes with calls that fail. Found at run time in
// the HDF5 library that netCDF loaded (no build dependency on HDF5).
void quietHdf5() {
    using SetAuto = int (*)(int64_t stack, void* func, void* data);
    static const auto setAuto = reinterpret_cast<SetAuto>(dlsym(RTLD_DEFAULT, "H5Eset_auto2"));
    if (setAuto != nullptr) setAuto(0 /* H5E_DEFAULT */, nullptr, nullptr);
}

// The netCDF-C version without its build date.
std::string netcdfVersion() {
    const std::string text = nc_inq_libvers();
    return text.substr(0, text.find(' '));
}

// The version of the HDF5 library that netCDF loaded.
std::string hdf5Version() {
    using GetVersion = int (*)(unsigned*, unsigned*, unsigned*);
    const auto get = reinterpret_cast<GetVersion>(dlsym(RTLD_DEFAULT, "H5get_libversion"));
    unsigned major = 0, minor = 0, release = 0;
    if (get == nullptr || get(&major, &minor, &release) < 0) return "(unknown)";
    return std::to_string(major) + "." + std::to_string(minor) + "." + std::to_string(release);
}

struct ContenderKind {
    std::string key;    // as given to --contenders
    std::string title;  // as shown in the tables
    std::string ext;
    std::function<std::unique_ptr<Contender>(std::mutex*)> make;
};

const std::vector<ContenderKind>& allKinds() {
    static const std::vector<ContenderKind> kinds = {
        {"raw", "raw stdio", ".raw", [](std::mutex*) { return std::make_unique<RawContender>(); }},
        {"tova", "tova", ".grd", [](std::mutex*) { return std::make_unique<TovaContender>(); }},
        {"nc3", "netCDF classic (64-bit offset)", ".nc",
         [](std::mutex* m) { return std::make_unique<NetcdfContender>(NC_64BIT_OFFSET, m); }},
        {"nc4", "netCDF-4 (HDF5)", ".nc4",
         [](std::mutex* m) { return std::make_unique<NetcdfContender>(NC_NETCDF4, m); }},
    };
    return kinds;
}

// ---- Values written and checked ----------------------------------------------------------

// Grid values: a smooth field per item, with one cell (the first stored
// cell) carrying the time step and item, so that a read of the wrong step
// shows. Reads are checked against a private copy (threads share this).
class GridValues {
public:
    explicit GridValues(const Shape& shape) : s_(shape) {
        if (s_.compressed()) mark_ = int64_t{(*s_.keyY)[0]} * s_.nx + (*s_.keyX)[0];
        const auto bytes = static_cast<size_t>(s_.cells()) * s_.elemSize();
        for (int i = 0; i < s_.items; ++i) {
            std::vector<unsigned char> b(bytes);
            for (int64_t k = 0; k < s_.cells(); ++k) {
                const double v = 10.0 * (i + 1) + std::sin(double(k) * 1e-3);
                if (s_.elem == Elem::Float) {
                    const float f = float(v);
                    std::memcpy(&b[size_t(k) * 4], &f, 4);
                } else {
                    std::memcpy(&b[size_t(k) * 8], &v, 8);
                }
            }
            std::vector<unsigned char> e = b;
            if (s_.compressed()) {
                std::vector<unsigned char> packed(s_.storedBytes());
                gather(s_, b.data(), packed.data());
                scatter(s_, packed.data(), e.data());
            }
            base_.push_back(std::move(b));
            expected_.push_back(std::move(e));
        }
    }
    size_t bytes() const { return static_cast<size_t>(s_.cells()) * s_.elemSize(); }
    // The array to write for (step, item): the item's field with its mark.
    const void* at(int step, int item) {
        void* p = base_[static_cast<size_t>(item)].data();
        setMark(p, mark(step, item));
        return p;
    }
    void check(const void* got, int step, int item) const {
        std::vector<unsigned char> have(static_cast<const unsigned char*>(got),
                                        static_cast<const unsigned char*>(got) + bytes());
        std::vector<unsigned char> want = expected_[static_cast<size_t>(item)];
        const bool marked = markOf(have.data()) == mark(step, item);
        setMark(have.data(), 0.0);
        setMark(want.data(), 0.0);
        if (!marked || have != want)
            fail("wrong values read at step " + std::to_string(step) + ", item " + std::to_string(item + 1));
    }

private:
    static double mark(int step, int item) { return step * 4.0 + item; }  // exact in float
    void setMark(void* p, double v) const {
        if (s_.elem == Elem::Float) static_cast<float*>(p)[mark_] = float(v);
        else static_cast<double*>(p)[mark_] = v;
    }
    double markOf(const void* p) const {
        return s_.elem == Elem::Float ? static_cast<const float*>(p)[mark_] : static_cast<const double*>(p)[mark_];
    }

    Shape s_;
    int64_t mark_ = 0;
    std::vector<std::vector<unsigned char>> base_;      // what the writer hands over
    std::vector<std::vector<unsigned char>> expected_;  // what a reader gets back
};

double seriesValue(int step, int item) { return step * 1000.0 + item; }

void checkSeries(double got, int step, int item) {
    if (got != seriesValue(step, item))
        fail("wrong value read at step " + std::to_string(step) + ", item " + std::to_string(item + 1));
}

// ---- Formatting ---------------------------------------------------------------------------

std::string fmt(const char* format, double v) {
    char text[64];
    std::snprintf(text, sizeof text, format, v);
    return text;
}

std::string fmtTime(double s) {
    if (std::isnan(s)) return "-";
    if (s >= 0.9995) return fmt("%.2f s", s);
    if (s >= 0.9995e-3) return fmt("%.3g ms", s * 1e3);
    if (s >= 0.9995e-6) return fmt("%.3g us", s * 1e6);
    return fmt("%.3g ns", s * 1e9);
}

std::string fmtRate(double bytesPerSecond) {
    if (std::isnan(bytesPerSecond)) return "-";
    if (bytesPerSecond >= 1e9) return fmt("%.2f GB/s", bytesPerSecond / 1e9);
    return fmt("%.0f MB/s", bytesPerSecond / 1e6);
}

std::string fmtRatio(double r) { return std::isnan(r) ? "-" : r >= 100 ? fmt("%.0fx", r) : fmt("%.2fx", r); }

std::string fmtCount(double n) {
    char text[32];
    std::snprintf(text, sizeof text, "%.0f", n);
    std::string s = text, out;
    for (size_t i = 0; i < s.size(); ++i) {
        if (i > 0 && (s.size() - i) % 3 == 0) out += ',';
        out += s[i];
    }
    return out;
}

double median(std::vector<double> v) {
    std::sort(v.begin(), v.end());
    const size_t n = v.size();
    return n == 0 ? NAN : n % 2 ? v[n / 2] : 0.5 * (v[n / 2 - 1] + v[n / 2]);
}

// ---- The workloads --------------------------------------------------------------------------

class Bench {
public:
    explicit Bench(const Options& o) : opt_(o), dir_(fs::absolute(o.dir)) {
        fs::create_directories(dir_);
        for (const auto& key : opt_.contenders) {
            const auto& all = allKinds();
            auto it = std::find_if(all.begin(), all.end(), [&](const ContenderKind& k) { return k.key == key; });
            if (it == all.end()) fail("unknown contender " + key);
            kinds_.push_back(&*it);
        }
    }

    void run() {
        std::printf("Times are %s. Libraries: tova %d, netCDF-C %s, HDF5 %s. Data files in %s.\n",
                    Clock::wall ? "wall-clock time"
                                : "process CPU time (user and system; the thread workload: wall-clock time; "
                                  "the large grids: both)",
                    grdGetVersionCurrent(), netcdfVersion().c_str(), hdf5Version().c_str(), dir_.string().c_str());
        if (opt_.runs(1)) largeGrids();
        if (opt_.runs(2)) timeSeries();
        if (opt_.runs(3)) randomAccess();
        if (opt_.runs(4)) openHeader();
        if (opt_.runs(5)) statistics();
        if (opt_.runs(6)) compressed();
        if (opt_.runs(7)) threads();
        if (opt_.runs(8)) scaling();
        if (opt_.runs(9)) wideFiles();
        printTargets();
    }

private:
    // Seconds and the operations (item time steps) and bytes they cover; the
    // ratios compare time per operation.
    struct Row {
        const ContenderKind* kind;
        double write = NAN, read = NAN, ops = 1, bytes = 0;
        std::string note;
        double writeCpu = NAN, readCpu = NAN;  // process CPU time where write and read are wall-clock
        double perOp(bool reading) const { return (reading ? read : write) / ops; }
    };
    struct Target {
        std::string workload, what, measured;
        bool met;
    };

    Options opt_;
    fs::path dir_;
    std::vector<const ContenderKind*> kinds_;
    std::vector<Target> targets_;

    std::string path(const ContenderKind& k, const std::string& stem) const {
        return (dir_ / (stem + k.ext)).string();
    }
    static void remove(const std::string& p) {
        std::error_code ec;
        fs::remove(p, ec);
    }
    static void progress(const std::string& what, const ContenderKind& k) {
        std::fprintf(stderr, "  %s: %s\n", what.c_str(), k.title.c_str());
    }
    void target(const std::string& w, const std::string& what, double measured, const std::string& shown, bool met) {
        if (!std::isnan(measured)) targets_.push_back({w, what, shown, met});
    }
    template <class T>
    static const T* find(const std::vector<T>& rows, const std::string& key) {
        for (const auto& r : rows)
            if (r.kind->key == key) return &r;
        return nullptr;
    }
    // time per op of row `key` over that of `over` (how many times faster
    // `over` is); NaN when either is missing.
    static double speedup(const std::vector<Row>& rows, const std::string& key, const std::string& over, bool reading) {
        const Row* a = find(rows, key);
        const Row* b = find(rows, over);
        return a && b ? a->perOp(reading) / b->perOp(reading) : NAN;
    }

    Shape gridShape(int steps) const {
        Shape s;
        s.items = opt_.gridItems, s.dims = 2, s.nx = s.ny = opt_.gridN, s.elem = Elem::Float, s.steps = steps;
        return s;
    }
    Shape seriesShape(int items, int steps) const {
        Shape s;
        s.items = items, s.dims = 0, s.elem = Elem::Double, s.steps = steps;
        return s;
    }

    // ---- Writing and reading whole files

    Timing writeGrid(Contender& c, const std::string& p, const Shape& s, GridValues& v) {
        const Stopwatch watch;
        c.create(p, s);
        for (int t = 0; t < s.steps; ++t)
            for (int i = 0; i < s.items; ++i) c.write(t, i, v.at(t, i));
        c.finish();
        return watch.elapsed();
    }
    Timing readGrid(Contender& c, const std::string& p, const Shape& s, const GridValues& v, void* buffer) const {
        const Stopwatch watch;
        c.open(p, s);
        for (int t = 0; t < s.steps; ++t)
            for (int i = 0; i < s.items; ++i) {
                c.read(t, i, buffer);
                if (opt_.verify) v.check(buffer, t, i);
            }
        c.close();
        const Timing spent = watch.elapsed();
        v.check(buffer, s.steps - 1, s.items - 1);
        return spent;
    }
    static double writeSeries(Contender& c, const std::string& p, const Shape& s) {
        const auto t0 = Clock::now();
        c.create(p, s);
        for (int t = 0; t < s.steps; ++t)
            for (int i = 0; i < s.items; ++i) {
                const double v = seriesValue(t, i);
                c.write(t, i, &v);
            }
        c.finish();
        return since(t0);
    }
    double readSeries(Contender& c, const std::string& p, const Shape& s) const {
        double v = 0, sum = 0;
        const auto t0 = Clock::now();
        c.open(p, s);
        for (int t = 0; t < s.steps; ++t)
            for (int i = 0; i < s.items; ++i) {
                c.read(t, i, &v);
                if (opt_.verify) checkSeries(v, t, i);
                sum += v;
            }
        c.close();
        const double sec = since(t0);
        const double n = s.steps, m = s.items;
        if (sum != 1000.0 * m * n * (n - 1) / 2 + n * m * (m - 1) / 2) fail("wrong sum of the values read");
        return sec;
    }

    // ---- Tables

    // One row per contender: write and read time, rate (or time per item time
    // step), speed relative to raw stdio, and how many times faster tova is.
    void printRows(const std::vector<Row>& rows, bool perOp) const {
        const bool notes = std::any_of(rows.begin(), rows.end(), [](const Row& r) { return !r.note.empty(); });
        const bool cpu = std::any_of(rows.begin(), rows.end(), [](const Row& r) { return !std::isnan(r.writeCpu); });
        std::printf("| contender | write | %s | read | %s | speed vs raw (write / read) | tova speed-up (write / read) |%s%s\n",
                    perOp ? "write per item-step" : "write rate", perOp ? "read per item-step" : "read rate",
                    cpu ? " CPU time: write / read | CPU time vs raw (write / read) |" : "", notes ? " note |" : "");
        std::printf("|---|---|---|---|---|---|---|%s%s\n", cpu ? "---|---|" : "", notes ? "---|" : "");
        const Row* raw = find(rows, "raw");
        for (const auto& r : rows) {
            auto rate = [&](double sec) { return perOp ? fmtTime(sec / r.ops) : fmtRate(r.bytes / sec); };
            std::string cpuCells;
            if (cpu)
                cpuCells = " " + fmtTime(r.writeCpu) + " / " + fmtTime(r.readCpu) + " | " +
                           fmtRatio(raw ? raw->writeCpu / r.writeCpu : NAN) + " / " +
                           fmtRatio(raw ? raw->readCpu / r.readCpu : NAN) + " |";
            std::printf("| %s | %s | %s | %s | %s | %s / %s | %s / %s |%s%s\n", r.kind->title.c_str(),
                        fmtTime(r.write).c_str(), rate(r.write).c_str(), fmtTime(r.read).c_str(),
                        rate(r.read).c_str(), fmtRatio(speedup(rows, "raw", r.kind->key, false)).c_str(),
                        fmtRatio(speedup(rows, "raw", r.kind->key, true)).c_str(),
                        fmtRatio(speedup(rows, r.kind->key, "tova", false)).c_str(),
                        fmtRatio(speedup(rows, r.kind->key, "tova", true)).c_str(), cpuCells.c_str(),
                        notes ? (" " + r.note + " |").c_str() : "");
        }
    }

    // The contender that comes i-th in round `round`: every round starts
    // with the next one, so that no contender always follows the same
    // other (the cost of writing into the page cache depends on what the
    // previous file left behind) and a change of the machine's load falls on
    // all of them.
    size_t turn(int round, size_t i) const {
        return (static_cast<size_t>(std::max(round, 0)) + i) % kinds_.size();
    }

    // Writes and reads a grid shape with every contender, repeats times, in
    // rounds over the contenders. An untimed round goes first, so that no
    // contender pays for the page cache's first growth. With throughput the
    // rows' times are wall-clock and their CPU times are kept beside them;
    // otherwise they are on the chosen clock.
    std::vector<Row> gridRows(const std::string& tag, const Shape& s, int repeats, bool throughput = false) {
        GridValues values(s);
        std::vector<unsigned char> buffer(values.bytes());
        const size_t n = kinds_.size();
        std::vector<std::vector<double>> w(n), r(n), wCpu(n), rCpu(n);
        std::vector<std::string> notes(n);
        for (int rep = -1; rep < repeats; ++rep)
            for (size_t i = 0; i < n; ++i) {
                const size_t j = turn(rep, i);
                const ContenderKind& k = *kinds_[j];
                progress(tag + (rep < 0 ? ", warm-up" : ", round " + std::to_string(rep + 1)), k);
                const std::string p = path(k, "grid");
                auto c = k.make(nullptr);
                const Timing timedWrite = writeGrid(*c, p, s, values);
                const Timing timedRead = readGrid(*c, p, s, values, buffer.data());
                const double tw = throughput ? timedWrite.wall : timedWrite.chosen();
                const double tr = throughput ? timedRead.wall : timedRead.chosen();
                if (k.key == "nc4" && rep == 0) notes[j] = "chunks " + NetcdfContender::chunking(p);
                remove(p);
                std::fprintf(stderr, "    write %.3f s, read %.3f s\n", tw, tr);
                if (rep < 0) continue;
                w[j].push_back(tw);
                r[j].push_back(tr);
                wCpu[j].push_back(timedWrite.cpu);
                rCpu[j].push_back(timedRead.cpu);
            }
        std::vector<Row> rows;
        for (size_t j = 0; j < n; ++j) {
            rows.push_back({kinds_[j], median(w[j]), median(r[j]), s.itemSteps(), s.totalBytes(), notes[j]});
            if (throughput) rows.back().writeCpu = median(wCpu[j]), rows.back().readCpu = median(rCpu[j]);
        }
        return rows;
    }

    // Writes a file of a scalar shape for later reading: the values of
    // writeSeries, as fast as the contender can (untimed).
    static void fillSeries(Contender& c, const std::string& p, const Shape& s) {
        c.create(p, s);
        std::vector<double> column(static_cast<size_t>(s.steps));
        for (int i = 0; i < s.items; ++i) {
            for (int t = 0; t < s.steps; ++t) column[static_cast<size_t>(t)] = seriesValue(t, i);
            if (!c.writeColumn(i, column.data())) {
                c.finish();
                writeSeries(c, p, s);
                return;
            }
        }
        c.finish();
    }

    void heading(const std::string& title, const std::string& text) const {
        std::printf("\n### %s\n\n%s\n\n", title.c_str(), text.c_str());
        std::fflush(stdout);
        std::fprintf(stderr, "%s\n", title.c_str());
    }

    // ---- 1. Large grids

    void largeGrids() {
        const Shape s = gridShape(opt_.gridSteps);
        heading("1. Large grids",
                std::to_string(s.items) + " float 2-D items of " + std::to_string(s.nx) + " x " +
                    std::to_string(s.ny) + ", " + std::to_string(s.steps) + " time steps (" +
                    fmt("%.2f", s.totalBytes() / 1e9) + " GB of values); write, then read all. Median of " +
                    std::to_string(opt_.gridRepeats) +
                    ". Times and rates are wall-clock (throughput: what the writer or reader waits for); the last "
                    "columns give the process CPU time (what it costs, every thread included).");
        const auto rows = gridRows("large grids", s, opt_.gridRepeats, true);
        printRows(rows, false);
        const Row* rawRow = find(rows, "raw");
        const Row* tovaRow = find(rows, "tova");
        for (bool reading : {false, true}) {
            const std::string op = reading ? "read" : "write";
            const double raw = speedup(rows, "raw", "tova", reading);
            const double rawCpu = rawRow && tovaRow ? (reading ? rawRow->readCpu / tovaRow->readCpu
                                                               : rawRow->writeCpu / tovaRow->writeCpu)
                                                    : NAN;
            const double nc3 = speedup(rows, "nc3", "tova", reading);
            const double nc4 = speedup(rows, "nc4", "tova", reading);
            target("1", "tova " + op + " throughput >= 0.9 x raw stdio", raw,
                   fmtRatio(raw) + " (CPU time " + fmtRatio(rawCpu) + ")", raw >= 0.9);
            target("1", "tova " + op + " >= 1.0 x netCDF classic", nc3, fmtRatio(nc3), nc3 >= 1.0);
            target("1", "tova " + op + " >= 2 x netCDF-4", nc4, fmtRatio(nc4), nc4 >= 2.0);
        }
    }

    // ---- 2. Time series

    void timeSeries() {
        heading("2. Time series",
                std::to_string(opt_.seriesItems) + " double scalar items, " + fmtCount(opt_.seriesSteps) +
                    " time steps, one call per item and time step; netCDF-4 writes and reads the first " +
                    fmtCount(opt_.seriesStepsNc4) +
                    " time steps only (its calls are too slow for all, see the note below). Median of " +
                    std::to_string(opt_.repeats) + ".");
        const size_t n = kinds_.size();
        std::vector<std::vector<double>> w(n), r(n);
        auto shapeOf = [&](const ContenderKind& k) {
            return seriesShape(opt_.seriesItems, k.key == "nc4" ? opt_.seriesStepsNc4 : opt_.seriesSteps);
        };
        for (int rep = 0; rep < opt_.repeats; ++rep)
            for (size_t i = 0; i < n; ++i) {
                const size_t j = turn(rep, i);
                const ContenderKind& k = *kinds_[j];
                progress("time series, round " + std::to_string(rep + 1), k);
                const Shape s = shapeOf(k);
                const std::string p = path(k, "series");
                auto c = k.make(nullptr);
                w[j].push_back(writeSeries(*c, p, s));
                r[j].push_back(readSeries(*c, p, s));
                remove(p);
            }
        std::vector<Row> rows;
        for (size_t j = 0; j < n; ++j) {
            const Shape s = shapeOf(*kinds_[j]);
            rows.push_back({kinds_[j], median(w[j]), median(r[j]), s.itemSteps(), s.totalBytes(),
                            fmtCount(s.steps) + " time steps"});
        }
        printRows(rows, true);
        const Row* tova = find(rows, "tova");
        for (bool reading : {false, true}) {
            const std::string op = reading ? "read" : "write";
            const double nc3 = speedup(rows, "nc3", "tova", reading);
            target("2", "tova " + op + " >= 10 x faster than netCDF classic per item-time-step", nc3, fmtRatio(nc3),
                   nc3 >= 10.0);
            const double ns = tova ? tova->perOp(reading) * 1e9 : NAN;
            target("2", "tova " + op + " <= 100 ns per call", ns, fmt("%.0f ns", ns), ns <= 100.0);
        }
    }

    // ---- 3. Random access

    // Reads at the given (time step, item) pairs in turn, for at most the
    // time budget; returns seconds per read.
    double timedReads(Contender& c, const std::vector<std::pair<int, int>>& pairs) const {
        double v = 0;
        size_t done = 0;
        const auto t0 = Clock::now();
        while (done < pairs.size()) {
            const auto [t, i] = pairs[done++];
            c.readAt(t, i, &v);
            if (opt_.verify) checkSeries(v, t, i);
            if (done % 256 == 0 && since(t0) > opt_.budget) break;
        }
        const double sec = since(t0);
        checkSeries(v, pairs[done - 1].first, pairs[done - 1].second);
        return sec / double(done);
    }

    void randomAccess() {
        const Shape s = seriesShape(opt_.seriesItems, opt_.randomSteps);
        std::vector<int> probes;
        for (int n : {10, 100, 1000, 10000})
            if (n <= s.steps) probes.push_back(n);
        if (probes.size() < 2 && (probes.empty() || probes.back() != s.steps)) probes.push_back(s.steps);
        heading("3. Random access",
                "A file of " + std::to_string(s.items) + " double scalar items and " + fmtCount(s.steps) +
                    " time steps: position to a random (time step, item) and read the one value, up to " +
                    fmtCount(opt_.randomReads) + " times or " + fmt("%g", opt_.budget) +
                    " s (median of " + std::to_string(opt_.repeats) +
                    " runs). Then, to show that the cost does not grow with the step number: position to "
                    "time step n and read one item, alternating with a time step half the file away (so that "
                    "no read finds its step still in a buffer), " +
                    fmtCount(opt_.randomProbes) + " times for each n (time per positioned read).");
        std::mt19937_64 rng(20240611);
        std::vector<std::pair<int, int>> pairs(static_cast<size_t>(opt_.randomReads));
        for (auto& [t, i] : pairs) {
            t = static_cast<int>(rng() % static_cast<uint64_t>(s.steps));
            i = static_cast<int>(rng() % static_cast<uint64_t>(s.items));
        }
        struct Result {
            const ContenderKind* kind;
            double random;
            std::vector<double> probe;
        };
        std::vector<Result> results;
        for (auto* k : kinds_) {
            progress("random access", *k);
            const std::string p = path(*k, "random");
            auto c = k->make(nullptr);
            fillSeries(*c, p, s);
            c->open(p, s);
            std::vector<double> runs;
            for (int rep = 0; rep < opt_.repeats; ++rep) runs.push_back(timedReads(*c, pairs));
            Result res{k, median(runs), {}};
            for (int n : probes) {
                std::vector<std::pair<int, int>> there;
                const int away = (n - 1 + s.steps / 2) % s.steps;
                for (int r = 0; r < opt_.randomProbes; ++r) {
                    there.emplace_back(away, (r + 1) % s.items);
                    there.emplace_back(n - 1, r % s.items);
                }
                std::vector<double> reps;
                for (int rep = 0; rep < opt_.repeats; ++rep) reps.push_back(timedReads(*c, there));
                res.probe.push_back(median(reps));
            }
            c->close();
            remove(p);
            results.push_back(res);
        }
        std::printf("| contender | random read | speed vs raw | tova speed-up |");
        for (int n : probes) std::printf(" step %s |", fmtCount(n).c_str());
        std::printf(" %s / %s |\n|---|---|---|---|", fmtCount(probes.back()).c_str(),
                    fmtCount(probes.front()).c_str());
        for (size_t i = 0; i <= probes.size(); ++i) std::printf("---|");
        std::printf("\n");
        auto of = [&](const std::string& key) -> const Result* { return find(results, key); };
        for (const auto& r : results) {
            const Result* raw = of("raw");
            const Result* tova = of("tova");
            std::printf("| %s | %s | %s | %s |", r.kind->title.c_str(), fmtTime(r.random).c_str(),
                        fmtRatio(raw ? raw->random / r.random : NAN).c_str(),
                        fmtRatio(tova ? r.random / tova->random : NAN).c_str());
            for (double t : r.probe) std::printf(" %s |", fmtTime(t).c_str());
            std::printf(" %s |\n", fmtRatio(r.probe.back() / r.probe.front()).c_str());
        }
        if (const Result* tova = of("tova")) {
            const double growth = *std::max_element(tova->probe.begin(), tova->probe.end()) /
                                  *std::min_element(tova->probe.begin(), tova->probe.end());
            target("3", "tova flat in the step number (slowest / fastest probe <= 2)", growth, fmtRatio(growth),
                   growth <= 2.0);
            if (const Result* nc4 = of("nc4")) {
                const double x = nc4->random / tova->random;
                target("3", "tova random read >= 10 x faster than netCDF-4", x, fmtRatio(x), x >= 10.0);
            }
        }
    }

    // ---- 4. Open

    // Median time to open a file of `items` scalar items and learn every
    // item's name, type and size: at least three opens, more up to the
    // count asked for while within the time budget.
    double openTime(const ContenderKind& k, int items) {
        const Shape s = seriesShape(items, 1);
        const std::string p = path(k, "open");
        auto c = k.make(nullptr);
        fillSeries(*c, p, s);
        std::vector<double> times;
        double total = 0;
        for (int r = 0; r < opt_.openRepeats && (r < 3 || total < opt_.budget); ++r) {
            const auto t0 = Clock::now();
            const int n = c->inspect(p);
            times.push_back(since(t0));
            total += times.back();
            if (n < items) fail(k.title + ": fewer items than written");
        }
        remove(p);
        return median(times);
    }

    void openHeader() {
        heading("4. Open",
                "Open a file of " + fmtCount(opt_.openItems) +
                    " items (double scalars, one time step), read its header and every item's name, type, unit "
                    "and size, close. Median of up to " +
                    std::to_string(opt_.openRepeats) + " opens (at least 3, more while within " +
                    fmt("%g", opt_.budget) + " s).");
        std::vector<Row> rows;
        for (auto* k : kinds_) {
            progress("open", *k);
            rows.push_back({k, NAN, openTime(*k, opt_.openItems), 1, 0, ""});
        }
        std::printf("| contender | open + header | speed vs raw | tova speed-up |\n|---|---|---|---|\n");
        for (const auto& r : rows)
            std::printf("| %s | %s | %s | %s |\n", r.kind->title.c_str(), fmtTime(r.read).c_str(),
                        fmtRatio(speedup(rows, "raw", r.kind->key, true)).c_str(),
                        fmtRatio(speedup(rows, r.kind->key, "tova", true)).c_str());
        if (const Row* tova = find(rows, "tova"))
            target("4", "tova open of " + fmtCount(opt_.openItems) + " items <= 10 ms", tova->read,
                   fmtTime(tova->read), tova->read <= 0.010);
    }

    // ---- 5. Statistics

    void statistics() {
        Shape s = gridShape(opt_.gridSteps);
        heading("5. Statistics",
                "Workload 1 written by tova with statistics type 1 (item-global extremes) and type 2 (also per "
                "element: extremes, sums for mean, variance and lag-one autocorrelation). Median of " +
                    std::to_string(opt_.repeats) +
                    (Clock::wall ? "; wall-clock time."
                                 : "; process CPU time, the statistics pass on the library's helper thread included."));
        const ContenderKind* tova = nullptr;
        const ContenderKind* raw = nullptr;
        for (auto* k : kinds_) {
            if (k->key == "tova") tova = k;
            if (k->key == "raw") raw = k;
        }
        if (tova == nullptr) return (void)std::printf("(tova not among the contenders)\n");
        GridValues values(s);
        // Three variants in rounds, each round starting with the next one.
        struct Variant {
            const ContenderKind* kind;
            int statsType;
            std::vector<double> times;
        };
        std::vector<Variant> variants = {{tova, 1, {}}, {tova, 2, {}}};
        if (raw) variants.push_back({raw, 1, {}});
        for (int rep = 0; rep < opt_.repeats; ++rep)
            for (size_t i = 0; i < variants.size(); ++i) {
                Variant& v = variants[(static_cast<size_t>(rep) + i) % variants.size()];
                std::fprintf(stderr, "  statistics, round %d: %s, type %d\n", rep + 1, v.kind->title.c_str(),
                             v.statsType);
                s.statsType = v.statsType;
                const std::string p = path(*v.kind, "stats");
                auto c = v.kind->make(nullptr);
                v.times.push_back(writeGrid(*c, p, s, values).chosen());
                remove(p);
            }
        const double t1 = median(variants[0].times), t2 = median(variants[1].times);
        const double tr = raw ? median(variants[2].times) : NAN;
        std::printf("| write | time | rate | speed vs raw | cost of type 2 |\n|---|---|---|---|---|\n");
        if (raw) std::printf("| raw stdio | %s | %s | 1.00x | |\n", fmtTime(tr).c_str(), fmtRate(s.totalBytes() / tr).c_str());
        std::printf("| tova, statistics type 1 | %s | %s | %s | |\n", fmtTime(t1).c_str(),
                    fmtRate(s.totalBytes() / t1).c_str(), fmtRatio(raw ? tr / t1 : NAN).c_str());
        std::printf("| tova, statistics type 2 | %s | %s | %s | %s the time of type 1 (+%s per element) |\n",
                    fmtTime(t2).c_str(), fmtRate(s.totalBytes() / t2).c_str(), fmtRatio(raw ? tr / t2 : NAN).c_str(),
                    fmtRatio(t2 / t1).c_str(), fmtTime((t2 - t1) / (double(s.stored()) * s.items * s.steps)).c_str());
    }

    // ---- 6. Compressed items

    void compressed() {
        Shape s = gridShape(opt_.compSteps);
        std::vector<int32_t> cells(static_cast<size_t>(s.cells()));
        std::iota(cells.begin(), cells.end(), 0);
        std::mt19937_64 rng(7);
        std::shuffle(cells.begin(), cells.end(), rng);
        cells.resize(static_cast<size_t>(std::max<double>(1, std::round(opt_.compFraction * double(s.cells())))));
        std::sort(cells.begin(), cells.end());
        std::vector<int32_t> keyX, keyY;
        for (int32_t k : cells) keyX.push_back(k % s.nx), keyY.push_back(k / s.nx);
        s.keyX = &keyX, s.keyY = &keyY;
        heading("6. Compressed items",
                std::to_string(s.items) + " float items on a " + std::to_string(s.nx) + " x " + std::to_string(s.ny) +
                    " grid of which " + fmt("%.0f", opt_.compFraction * 100) + " % of the cells (" +
                    fmtCount(s.stored()) + ", scattered) are stored through encoding keys; " +
                    std::to_string(s.steps) +
                    " time steps. tova gathers and scatters itself; raw stdio and netCDF (compression by gathering "
                    "onto a cell dimension) do it in the caller. Rates count stored bytes. Median of " +
                    std::to_string(opt_.repeats) + ".");
        printRows(gridRows("compressed", s, opt_.repeats), false);
    }

    // ---- 7. Threads

    void threads() {
        const Shape s = gridShape(opt_.threadSteps);
        const int most = *std::max_element(opt_.threads.begin(), opt_.threads.end());
        heading("7. Threads",
                "1, 2 and 4 threads each read their own copy of workload 1 (" + std::to_string(s.steps) +
                    " time steps, " + fmt("%.2f", s.totalBytes() / 1e9) +
                    " GB per copy). Aggregate read rate (wall-clock time) and speed-up over one thread; *cores "
                    "busy* is the CPU time of the reading threads over the wall-clock time: what the threads got "
                    "of the machine (at most the thread count or the free cores; a lock holds it near 1). "
                    "netCDF-C and HDF5 are not thread-safe: every netCDF call holds one global lock. The machine "
                    "has " +
                    std::to_string(std::thread::hardware_concurrency()) + " hardware threads. Median of " +
                    std::to_string(opt_.repeats) + ".");
        GridValues values(s);
        std::mutex netcdfLock;
        std::printf("| contender |");
        for (int n : opt_.threads) std::printf(" %d thread%s |", n, n == 1 ? "" : "s");
        for (int n : opt_.threads)
            if (n != 1) std::printf(" speed-up %d |", n);
        std::printf(" cores busy (");
        for (size_t i = 0; i < opt_.threads.size(); ++i) std::printf("%s%d", i ? " / " : "", opt_.threads[i]);
        std::printf(") |\n|---|");
        for (size_t i = 0; i < opt_.threads.size() * 2; ++i) std::printf("---|");
        std::printf("\n");
        for (auto* k : kinds_) {
            progress("threads", *k);
            std::mutex* lock = k->key.rfind("nc", 0) == 0 ? &netcdfLock : nullptr;
            std::vector<std::string> copies;
            for (int i = 0; i < most; ++i) {
                copies.push_back(path(*k, "thread" + std::to_string(i)));
                auto c = k->make(nullptr);
                writeGrid(*c, copies.back(), s, values);
            }
            std::vector<double> rate, busy;
            for (int n : opt_.threads) {
                std::vector<double> runs, used;
                for (int rep = 0; rep < opt_.repeats; ++rep) {
                    // The clock starts when every thread is ready and
                    // before any is let go.
                    std::latch armed(n), go(1);
                    std::vector<std::thread> pool;
                    std::vector<std::string> errors(static_cast<size_t>(n));
                    std::vector<double> cpu(static_cast<size_t>(n));
                    for (int i = 0; i < n; ++i)
                        pool.emplace_back([&, i] {
                            try {
                                quietHdf5();
                                auto c = k->make(lock);
                                std::vector<unsigned char> buffer(values.bytes());
                                armed.count_down();
                                go.wait();
                                const double c0 = threadCpuNow();
                                readGrid(*c, copies[static_cast<size_t>(i)], s, values, buffer.data());
                                cpu[static_cast<size_t>(i)] = threadCpuNow() - c0;
                            } catch (const std::exception& e) {
                                errors[static_cast<size_t>(i)] = e.what();
                            }
                        });
                    armed.wait();
                    const double t0 = wallNow();
                    go.count_down();
                    for (auto& t : pool) t.join();
                    runs.push_back(wallNow() - t0);
                    used.push_back(std::accumulate(cpu.begin(), cpu.end(), 0.0) / runs.back());
                    for (const auto& e : errors)
                        if (!e.empty()) fail(e);
                }
                rate.push_back(n * s.totalBytes() / median(runs));
                busy.push_back(median(used));
            }
            for (const auto& p : copies) remove(p);
            std::printf("| %s |", k->title.c_str());
            for (double r : rate) std::printf(" %s |", fmtRate(r).c_str());
            for (size_t i = 0; i < opt_.threads.size(); ++i)
                if (opt_.threads[i] != 1) std::printf(" %s |", fmtRatio(rate[i] / rate[0]).c_str());
            std::printf(" ");
            for (size_t i = 0; i < busy.size(); ++i) std::printf("%s%.2f", i ? " / " : "", busy[i]);
            std::printf(" |\n");
            if (k->key == "tova")
                for (size_t i = 0; i < opt_.threads.size(); ++i)
                    if (opt_.threads[i] == 2) {
                        const double x = rate[i] / rate[0];
                        target("7", "tova read with 2 threads >= 1.7 x one thread", x, fmtRatio(x), x >= 1.7);
                    }
        }
    }

    // ---- 8. Scaling

    // Growth of time from size a to size b, as the exponent e of
    // time ~ size^e (1: linear, 2: quadratic).
    static double exponent(double ta, double tb, double a, double b) { return std::log(tb / ta) / std::log(b / a); }

    void scalingTable(const std::string& what, const std::vector<int>& sizes,
                      const std::function<double(const ContenderKind&, int)>& measure) {
        std::printf("| contender |");
        for (int n : sizes) std::printf(" %s |", fmtCount(n).c_str());
        for (size_t i = 1; i < sizes.size(); ++i)
            std::printf(" growth %s -> %s |", fmtCount(sizes[i - 1]).c_str(), fmtCount(sizes[i]).c_str());
        std::printf("\n|---|");
        for (size_t i = 0; i < sizes.size() * 2 - 1; ++i) std::printf("---|");
        std::printf("\n");
        for (auto* k : kinds_) {
            progress("scaling, " + what, *k);
            std::vector<double> t;
            for (int n : sizes) t.push_back(measure(*k, n));
            std::printf("| %s |", k->title.c_str());
            for (double x : t) std::printf(" %s |", fmtTime(x).c_str());
            for (size_t i = 1; i < t.size(); ++i) std::printf(" %s |", fmtRatio(t[i] / t[i - 1]).c_str());
            std::printf("\n");
            if (k->key == "tova" && t.size() >= 2) {
                const size_t n = t.size();
                const double e = exponent(t[n - 2], t[n - 1], sizes[n - 2], sizes[n - 1]);
                target("8", "tova " + what + " linear (exponent of the largest step <= 1.1)", e,
                       fmt("time ~ n^%.2f", e), e <= 1.1);
            }
        }
    }

    void scaling() {
        heading("8. Scaling",
                "Write time versus the number of time steps (" + std::to_string(opt_.seriesItems) +
                    " double scalar items), and open time (as workload 4) versus the number of items. Growth is "
                    "the ratio of consecutive times (linear: the ratio of the sizes). Medians of " +
                    std::to_string(opt_.repeats) + " writes and " + std::to_string(opt_.openRepeats) + " opens.");
        std::printf("Write time by number of time steps:\n\n");
        scalingTable("write time in the number of time steps", opt_.scaleSteps, [&](const ContenderKind& k, int n) {
            const Shape s = seriesShape(opt_.seriesItems, n);
            std::vector<double> w;
            for (int rep = 0; rep < opt_.repeats; ++rep) {
                const std::string p = path(k, "scale");
                auto c = k.make(nullptr);
                w.push_back(writeSeries(*c, p, s));
                remove(p);
            }
            return median(w);
        });
        std::printf("\nOpen time by number of items:\n\n");
        scalingTable("open time in the number of items", opt_.scaleItems, [&](const ContenderKind& k, int n) {
            return k.key == "nc4" && n > opt_.nc4OpenMax ? NAN : openTime(k, n);
        });
        std::printf("\nnetCDF-4 opens of more than %s items are skipped: they take minutes.\n",
                    fmtCount(opt_.nc4OpenMax).c_str());
    }

    // ---- 9. Wide files

    struct WideResult {
        const ContenderKind* kind;
        double create = NAN, close = NAN, open = NAN, first = NAN, last = NAN;
    };

    // Create (the header of every item), write all steps (untimed), close
    // (for tova: the final header update); the medians of the rounds. The
    // file of the last round stays.
    void wideWrite(const ContenderKind& k, const std::string& p, const Shape& s, WideResult& r) const {
        std::vector<double> created, closed;
        for (int rep = 0; rep < opt_.repeats; ++rep) {
            auto c = k.make(nullptr);
            auto t0 = Clock::now();
            c->create(p, s);
            created.push_back(since(t0));
            for (int t = 0; t < s.steps; ++t)
                for (int i = 0; i < s.items; ++i) {
                    const double v = seriesValue(t, i);
                    c->write(t, i, &v);
                }
            t0 = Clock::now();
            c->finish();
            closed.push_back(since(t0));
        }
        r.create = median(created);
        r.close = median(closed);
    }

    void wideFiles() {
        const Shape s = seriesShape(opt_.wideItems, opt_.wideSteps);
        heading("9. Wide files",
                "A file of " + fmtCount(s.items) + " double scalar items and " + fmtCount(s.steps) +
                    " time steps. Create (the file and its header) and close after writing every step (for tova "
                    "the final in-place update of the header), median of " + std::to_string(opt_.repeats) +
                    "; open as workload 4; then a positioned read of the first and of the last item of a "
                    "random time step, " + fmtCount(opt_.wideReads) + " times each (median of " +
                    std::to_string(opt_.repeats) + " runs). netCDF-4 is left out (its open of this many "
                    "variables takes minutes).");
        std::mt19937_64 rng(20241124);
        std::vector<std::pair<int, int>> first(static_cast<size_t>(opt_.wideReads)), last(first.size());
        for (size_t n = 0; n < first.size(); ++n) {
            const int t = static_cast<int>(rng() % static_cast<uint64_t>(s.steps));
            first[n] = {t, 0};
            last[n] = {t, s.items - 1};
        }
        std::vector<WideResult> results;
        for (auto* k : kinds_) {
            if (k->key == "nc4") continue;
            progress("wide files", *k);
            WideResult r{k};
            const std::string p = path(*k, "wide");
            wideWrite(*k, p, s, r);
            auto c = k->make(nullptr);
            std::vector<double> opens;
            for (int rep = 0; rep < std::max(3, opt_.repeats); ++rep) {
                const auto t0 = Clock::now();
                if (c->inspect(p) < s.items) fail(k->title + ": fewer items than written");
                opens.push_back(since(t0));
            }
            r.open = median(opens);
            c->open(p, s);
            std::vector<double> a, b;
            for (int rep = 0; rep < opt_.repeats; ++rep) {
                a.push_back(timedReads(*c, first));
                b.push_back(timedReads(*c, last));
            }
            r.first = median(a), r.last = median(b);
            c->close();
            remove(p);
            results.push_back(r);
        }
        std::printf("| contender | create | close | close / create | open | positioned read, first item | "
                    "last item | last / first |\n|---|---|---|---|---|---|---|---|\n");
        for (const auto& r : results)
            std::printf("| %s | %s | %s | %s | %s | %s | %s | %s |\n", r.kind->title.c_str(), fmtTime(r.create).c_str(),
                        fmtTime(r.close).c_str(), fmtRatio(r.close / r.create).c_str(), fmtTime(r.open).c_str(),
                        fmtTime(r.first).c_str(), fmtTime(r.last).c_str(), fmtRatio(r.last / r.first).c_str());
        const WideResult* tova = find(results, "tova");
        if (tova == nullptr) return;
        const double closeRatio = tova->close / tova->create;
        target("9", "tova close <= 2 x its create", closeRatio, fmtRatio(closeRatio), closeRatio <= 2.0);
        const double lastRatio = tova->last / tova->first;
        target("9", "tova positioned read of the last item <= 1.5 x the first", lastRatio, fmtRatio(lastRatio),
               lastRatio <= 1.5);
        if (const WideResult* raw = find(results, "raw")) {
            const double x = tova->first / raw->first;
            target("9", "tova positioned read of the first item <= 10 x raw stdio", x, fmtRatio(x), x <= 10.0);
        }
        if (const WideResult* nc3 = find(results, "nc3")) {
            const double open = nc3->open / tova->open, read = nc3->last / tova->last;
            target("9", "tova open >= 1.0 x netCDF classic", open, fmtRatio(open), open >= 1.0);
            target("9", "tova positioned read of the last item >= 1.0 x netCDF classic", read, fmtRatio(read),
                   read >= 1.0);
        }
    }

    void printTargets() const {
        if (targets_.empty()) return;
        std::printf("\n### Targets\n\n| workload | target | measured | met |\n|---|---|---|---|\n");
        for (const auto& t : targets_)
            std::printf("| %s | %s | %s | %s |\n", t.workload.c_str(), t.what.c_str(), t.measured.c_str(),
                        t.met ? "yes" : "**no**");
    }
};

}  // namespace

int main(int argc, char** argv) {
    try {
        const Options opt = parseOptions(argc, argv);
        Bench(opt).run();
        std::fflush(stdout);
        return 0;
    } catch (const std::exception& e) {
        std::fflush(stdout);
        std::fprintf(stderr, "peers: %s\n", e.what());
        return 1;
    }
}
