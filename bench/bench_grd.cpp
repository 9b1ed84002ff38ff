// Benchmarks of the gridded data files: the same values written and read
// through plain stdio (fwrite/fread of the same bytes, with the same stream
// buffer size) and through the data-file API, in one run, with the ratio of
// the two. Cases:
//   LargeGrids  3 float EqD2 items of 1000 x 1000, 100 time steps, statistics
//               type 1, no conversion: throughput, and the peak memory that
//               writing adds;
//   SmallItems  500 double EqD0 items, 20,000 time steps: time per item call;
//   FindTimeStep  a random time step of a file of n steps, then one item read.
// Times are process CPU time, but for the large grids' throughput, which is
// wall-clock time (with the CPU-time ratios beside it). Files go to $TMPDIR
// (default /tmp) and are removed.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <ctime>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include <unistd.h>

#include "tova/grd.h"

namespace {

// Process CPU time (user and system): the machine these figures come from is
// shared, and waiting for a processor is not the library's cost.
struct Clock {
    using time_point = double;
    static double now() {
        timespec t{};
        clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &t);
        return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
    }
};

// What the library gives its streams: for writing and for reading only.
constexpr size_t kWriteBuffer = 256 * 1024;
constexpr size_t kReadBuffer = 16 * 1024;

std::string scratchPath(const char* name) {
    const char* dir = std::getenv("TMPDIR");
    return std::string(dir != nullptr && dir[0] != '\0' ? dir : "/tmp") + "/tova-bench-" +
           std::to_string(::getpid()) + "-" + name;
}

double since(Clock::time_point start) { return Clock::now() - start; }

// The large grids count both clocks: the wall-clock time is the throughput a
// writer sees, the process CPU time what it costs (the library's helper
// thread, which scans the statistics of large items beside the write,
// included).
struct Spent {
    double wall = 0, cpu = 0;
};
struct Watch {
    double wall0 = wallNow(), cpu0 = Clock::now();
    static double wallNow() {
        timespec t{};
        clock_gettime(CLOCK_MONOTONIC, &t);
        return static_cast<double>(t.tv_sec) + static_cast<double>(t.tv_nsec) * 1e-9;
    }
    Spent spent() const { return {wallNow() - wall0, Clock::now() - cpu0}; }
};

void check(bool ok, const char* what) {
    if (!ok) {
        std::fprintf(stderr, "bench_grd: %s failed\n", what);
        std::exit(1);
    }
}

// A plain stdio stream with the library's buffer size.
struct RawFile {
    std::FILE* f;
    std::vector<char> buffer;
    RawFile(const std::string& path, const char* mode)
        : f(std::fopen(path.c_str(), mode)), buffer(std::string(mode) == "rb" ? kReadBuffer : kWriteBuffer) {
        check(f != nullptr, "fopen");
        std::setvbuf(f, buffer.data(), _IOFBF, buffer.size());
    }
    ~RawFile() { check(std::fclose(f) == 0, "fclose"); }
};

// A header of n items of one data type on an equidistant time axis; nx x ny
// gives an EqD2 axis, nx alone EqD1, neither EqD0.
HeaderHandle makeHeader(int32_t n, int32_t dataType, int32_t nx, int32_t ny) {
    HeaderHandle h = nullptr;
    check(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "bench", "bench_grd", 1, n, 1, &h) == 0, "grdHeaderCreate");
    check(grdSetEqTimeAxis(h, 1400, 0.0, 60.0, 0) == 0, "grdSetEqTimeAxis");
    for (int32_t i = 1; i <= n; ++i) {
        ItemHandle item = grdItemD(h, i);
        check(grdSetItemInfo(h, item, 999, "item", 0, dataType) == 0, "grdSetItemInfo");
        if (nx > 0 && ny > 0) check(grdSetItemAxisEqD2(item, 0, nx, ny, 0, 0, 1, 1) == 0, "axis");
        else if (nx > 0) check(grdSetItemAxisEqD1(item, 0, nx, 0, 1) == 0, "axis");
    }
    return h;
}

// Peak resident memory since the last reset, and its reset (Linux).
int64_t residentKb(const char* field) {
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line))
        if (line.rfind(field, 0) == 0) return std::atoll(line.c_str() + std::char_traits<char>::length(field));
    return -1;
}
void resetPeakResident() { std::ofstream("/proc/self/clear_refs") << "5"; }

// ---- Large grids -------------------------------------------------------------------------------

constexpr int32_t kGridItems = 3;
constexpr int32_t kNx = 1000;
constexpr int32_t kNy = 1000;
constexpr int32_t kGridSteps = 100;
constexpr size_t kGridValues = static_cast<size_t>(kNx) * kNy;

std::vector<std::vector<float>> gridData() {
    std::mt19937 random(42);
    std::uniform_real_distribution<float> value(-100.0f, 100.0f);
    std::vector<std::vector<float>> data(kGridItems, std::vector<float>(kGridValues));
    for (auto& item : data)
        for (float& v : item) v = value(random);
    return data;
}

Spent writeGridsRaw(const std::string& path, const std::vector<std::vector<float>>& data) {
    const Watch watch;
    {
        RawFile raw(path, "wb");
        for (int32_t s = 0; s < kGridSteps; ++s)
            for (const auto& item : data) check(std::fwrite(item.data(), 4, kGridValues, raw.f) == kGridValues, "fwrite");
    }
    return watch.spent();
}

Spent readGridsRaw(const std::string& path, std::vector<float>& buffer) {
    const Watch watch;
    {
        RawFile raw(path, "rb");
        for (int32_t s = 0; s < kGridSteps; ++s)
            for (int32_t i = 0; i < kGridItems; ++i)
                check(std::fread(buffer.data(), 4, kGridValues, raw.f) == kGridValues, "fread");
    }
    return watch.spent();
}

Spent writeGridsTova(const std::string& path, HeaderHandle h, const std::vector<std::vector<float>>& data) {
    const Watch watch;
    FileHandle f = nullptr;
    check(grdFileCreate(path.c_str(), h, &f) == 0, "grdFileCreate");
    for (int32_t s = 0; s < kGridSteps; ++s)
        for (const auto& item : data) check(grdWriteItemTimeStep(h, f, s * 60.0, item.data()) == 0, "write");
    check(grdFileClose(h, &f) == 0, "grdFileClose");
    return watch.spent();
}

Spent readGridsTova(const std::string& path, std::vector<float>& buffer) {
    const Watch watch;
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    check(grdFileRead(path.c_str(), &h, &f) == 0, "grdFileRead");
    double time = 0;
    for (int32_t s = 0; s < kGridSteps; ++s)
        for (int32_t i = 0; i < kGridItems; ++i) check(grdReadItemTimeStep(h, f, &time, buffer.data()) == 0, "read");
    check(grdFileClose(h, &f) == 0, "grdFileClose");
    grdHeaderDestroy(&h);
    return watch.spent();
}

void LargeGrids(benchmark::State& state) {
    const std::vector<std::vector<float>> data = gridData();
    std::vector<float> buffer(kGridValues);
    const std::string path = scratchPath("grids");
    // Each side writes, reads and removes its file in turn, from the same
    // page-cache state; the fastest round of each counts, on each clock (the
    // machine is shared, and the page cache makes single rounds noisy).
    Spent rawWrite{1e30, 1e30}, tovaWrite{1e30, 1e30}, rawRead{1e30, 1e30}, tovaRead{1e30, 1e30};
    auto keepBest = [](Spent& best, const Spent& s) {
        best.wall = std::min(best.wall, s.wall);
        best.cpu = std::min(best.cpu, s.cpu);
    };
    int64_t peakExtraKb = 0;
    int64_t round = 0;
    for (auto _ : state) {
        for (int side = 0; side < 2; ++side) {
            if ((side == 0) == (round % 2 == 0)) {
                keepBest(rawWrite, writeGridsRaw(path, data));
                keepBest(rawRead, readGridsRaw(path, buffer));
            } else {
                HeaderHandle h = makeHeader(kGridItems, 1, kNx, kNy);
                const int64_t before = residentKb("VmRSS:");
                resetPeakResident();
                keepBest(tovaWrite, writeGridsTova(path, h, data));
                peakExtraKb = std::max(peakExtraKb, residentKb("VmHWM:") - before);
                keepBest(tovaRead, readGridsTova(path, buffer));
                grdHeaderDestroy(&h);
            }
            std::remove(path.c_str());
        }
        ++round;
    }
    const double mb = static_cast<double>(kGridSteps) * kGridItems * kGridValues * 4 / 1e6;
    state.counters["raw_write_MBps"] = mb / rawWrite.wall;
    state.counters["tova_write_MBps"] = mb / tovaWrite.wall;
    state.counters["write_ratio"] = rawWrite.wall / tovaWrite.wall;
    state.counters["write_ratio_cpu"] = rawWrite.cpu / tovaWrite.cpu;
    state.counters["raw_read_MBps"] = mb / rawRead.wall;
    state.counters["tova_read_MBps"] = mb / tovaRead.wall;
    state.counters["read_ratio"] = rawRead.wall / tovaRead.wall;
    state.counters["read_ratio_cpu"] = rawRead.cpu / tovaRead.cpu;
    state.counters["write_peak_extra_MB"] = static_cast<double>(peakExtraKb) / 1024.0;
}
BENCHMARK(LargeGrids)->Iterations(6)->Unit(benchmark::kMillisecond);

// ---- Many small items --------------------------------------------------------------------------

constexpr int32_t kSmallItems = 500;
constexpr int32_t kSmallSteps = 20000;

void SmallItems(benchmark::State& state) {
    const std::string rawPath = scratchPath("small.raw");
    const std::string tovaPath = scratchPath("small.grd");
    const double calls = static_cast<double>(kSmallItems) * kSmallSteps;
    double rawWrite = 0, tovaWrite = 0, rawRead = 0, tovaRead = 0;
    for (auto _ : state) {
        HeaderHandle h = makeHeader(kSmallItems, 2, 0, 0);
        double value = 0;
        auto start = Clock::now();
        {
            RawFile raw(rawPath, "wb");
            for (int32_t s = 0; s < kSmallSteps; ++s)
                for (int32_t i = 0; i < kSmallItems; ++i) {
                    value = s + i * 1e-3;
                    check(std::fwrite(&value, 8, 1, raw.f) == 1, "fwrite");
                }
        }
        rawWrite += since(start);

        start = Clock::now();
        FileHandle f = nullptr;
        check(grdFileCreate(tovaPath.c_str(), h, &f) == 0, "grdFileCreate");
        for (int32_t s = 0; s < kSmallSteps; ++s)
            for (int32_t i = 0; i < kSmallItems; ++i) {
                value = s + i * 1e-3;
                check(grdWriteItemTimeStep(h, f, s, &value) == 0, "write");
            }
        check(grdFileClose(h, &f) == 0, "grdFileClose");
        tovaWrite += since(start);
        grdHeaderDestroy(&h);

        double rawSum = 0, tovaSum = 0;
        start = Clock::now();
        {
            RawFile raw(rawPath, "rb");
            for (int32_t s = 0; s < kSmallSteps; ++s)
                for (int32_t i = 0; i < kSmallItems; ++i) {
                    check(std::fread(&value, 8, 1, raw.f) == 1, "fread");
                    rawSum += value;
                }
        }
        rawRead += since(start);

        start = Clock::now();
        check(grdFileRead(tovaPath.c_str(), &h, &f) == 0, "grdFileRead");
        double time = 0;
        for (int32_t s = 0; s < kSmallSteps; ++s)
            for (int32_t i = 0; i < kSmallItems; ++i) {
                check(grdReadItemTimeStep(h, f, &time, &value) == 0, "read");
                tovaSum += value;
            }
        check(grdFileClose(h, &f) == 0, "grdFileClose");
        tovaRead += since(start);
        grdHeaderDestroy(&h);
        check(rawSum == tovaSum, "same values");
        std::remove(rawPath.c_str());
        std::remove(tovaPath.c_str());
    }
    const double n = calls * static_cast<double>(state.iterations()) / 1e9;
    state.counters["raw_write_ns_per_call"] = rawWrite / n;
    state.counters["tova_write_ns_per_call"] = tovaWrite / n;
    state.counters["raw_read_ns_per_call"] = rawRead / n;
    state.counters["tova_read_ns_per_call"] = tovaRead / n;
}
BENCHMARK(SmallItems)->Iterations(2)->Unit(benchmark::kMillisecond);

// ---- Finding a time step -----------------------------------------------------------------------

constexpr int32_t kFindItems = 4;
constexpr int32_t kFindValues = 256;

void FindTimeStep(benchmark::State& state) {
    const auto steps = static_cast<int32_t>(state.range(0));
    const std::string path = scratchPath("find.grd");
    HeaderHandle h = makeHeader(kFindItems, 1, kFindValues, 0);
    FileHandle f = nullptr;
    check(grdFileCreate(path.c_str(), h, &f) == 0, "grdFileCreate");
    std::vector<float> values(kFindValues);
    for (int32_t s = 0; s < steps; ++s)
        for (int32_t i = 0; i < kFindItems; ++i) {
            values[0] = static_cast<float>(s);
            check(grdWriteItemTimeStep(h, f, s, values.data()) == 0, "write");
        }
    check(grdFileClose(h, &f) == 0, "grdFileClose");
    grdHeaderDestroy(&h);

    check(grdFileRead(path.c_str(), &h, &f) == 0, "grdFileRead");
    std::mt19937 random(7);
    std::uniform_int_distribution<int32_t> step(0, steps - 1);
    double time = 0;
    for (auto _ : state) {
        const int32_t t = step(random);
        check(grdFindTimeStep(h, f, t) == 0, "grdFindTimeStep");
        check(grdReadItemTimeStep(h, f, &time, values.data()) == 0, "read");
        check(values[0] == static_cast<float>(t), "the step found");
    }
    grdFileClose(h, &f);
    grdHeaderDestroy(&h);
    std::remove(path.c_str());
    state.SetLabel(std::to_string(steps) + " steps");
}
BENCHMARK(FindTimeStep)->Arg(1000)->Arg(10000)->Unit(benchmark::kMicrosecond);

}  // namespace
