// Cross-section files: writing and loading large files (50 raw points per
// cross section) in ascending, descending and random key order, keys-only
// loads, finds and walks over a loaded table.
#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <map>
#include <random>
#include <string>
#include <vector>

#include <unistd.h>

#include <benchmark/benchmark.h>

#include "tova/xfs.h"

namespace {

constexpr uint16_t kRawPoints = 50;
constexpr int kPerRiver = 5000;

struct Key {
    std::string river;
    double chainage;
};

Key keyOf(int i) {
    char river[16];
    std::snprintf(river, sizeof river, "river%03d", i / kPerRiver);
    return {river, (i % kPerRiver) * 10.0};
}

enum Order { Ascending, Descending, Random };

std::vector<int> orderOf(int count, Order order) {
    std::vector<int> ids(static_cast<size_t>(count));
    for (int i = 0; i < count; ++i) ids[static_cast<size_t>(i)] = i;
    if (order == Descending) std::reverse(ids.begin(), ids.end());
    if (order == Random) std::shuffle(ids.begin(), ids.end(), std::mt19937(12345));
    return ids;
}

// Folder of the generated files, removed at exit.
struct Scratch {
    std::filesystem::path dir = std::filesystem::temp_directory_path() /
                                ("tova-bench-xsec-" + std::to_string(::getpid()));
    Scratch() { std::filesystem::create_directories(dir); }
    ~Scratch() {
        std::error_code ec;
        std::filesystem::remove_all(dir, ec);
    }
};
Scratch& scratch() {
    static Scratch s;
    return s;
}

bool writeFile(const std::string& path, int count, Order order) {
    FileHandle file = nullptr;
    if (xfsFileOpenCreate(path.c_str(), &file) != 0) return false;
    bool ok = true;
    for (int i : orderOf(count, order)) {
        const Key key = keyOf(i);
        XsecHandle x = xfsXsecCreateEx(key.river.c_str(), key.chainage, "reach", "bench");
        ok = ok && x != nullptr && xfsXsecSetNoRaw(x, kRawPoints) == 1;
        if (ok) {
            for (uint32_t p = 0; p < kRawPoints; ++p) {
                x->raw[0][p] = p * 2.0;
                x->raw[1][p] = key.chainage;
                x->raw[2][p] = 100.0 - p;
                x->raw3[p] = 0.03;
                x->rawMark[0][p] = static_cast<uint16_t>(p);
            }
            ok = xfsXsecWrite(x, file) == 0;
        }
        xfsXsecFree(&x);
    }
    return xfsFileClose(&file) == 0 && ok;
}

// The file of count cross sections in the given order, written once.
const std::string& fileFor(int count, Order order) {
    static std::map<std::pair<int, int>, std::string> files;
    auto [it, added] = files.try_emplace({count, order});
    if (added) {
        it->second = (scratch().dir / ("xs-" + std::to_string(count) + "-" + std::to_string(order) + ".xfs")).string();
        if (!writeFile(it->second, count, order)) it->second.clear();
    }
    return it->second;
}

void BM_Write(benchmark::State& state) {
    const int count = static_cast<int>(state.range(0));
    const std::string path = (scratch().dir / "write.xfs").string();
    for (auto _ : state) {
        if (!writeFile(path, count, Ascending)) state.SkipWithError("write failed");
    }
    state.counters["MB"] = static_cast<double>(std::filesystem::file_size(path)) / 1e6;
    state.SetItemsProcessed(state.iterations() * count);
}

void BM_Load(benchmark::State& state) {
    const int count = static_cast<int>(state.range(0));
    const auto order = static_cast<Order>(state.range(1));
    const uint32_t flags = static_cast<uint32_t>(state.range(2));
    const std::string& path = fileFor(count, order);
    if (path.empty()) state.SkipWithError("could not write the file");
    for (auto _ : state) {
        XsecTableHandle table = nullptr;
        if (xfsXsecTableLoad(path.c_str(), &table, flags) != 0) state.SkipWithError("load failed");
        state.PauseTiming();
        xfsXsecTableFree(&table);
        state.ResumeTiming();
    }
    state.SetItemsProcessed(state.iterations() * count);
}

void BM_Find(benchmark::State& state) {
    const int count = static_cast<int>(state.range(0));
    XsecTableHandle table = nullptr;
    if (xfsXsecTableLoad(fileFor(count, Ascending).c_str(), &table, XFS_LOAD_KEYS_ONLY) != 0)
        state.SkipWithError("load failed");
    std::mt19937 random(7);
    std::uniform_int_distribution<int> pick(0, count - 1);
    for (auto _ : state) {
        const Key key = keyOf(pick(random));
        XsecCursor cursor = nullptr;
        benchmark::DoNotOptimize(xfsXsecFind(table, key.river.c_str(), key.chainage, "reach", &cursor));
    }
    xfsXsecTableFree(&table);
}

void BM_Walk(benchmark::State& state) {
    const int count = static_cast<int>(state.range(0));
    XsecTableHandle table = nullptr;
    if (xfsXsecTableLoad(fileFor(count, Ascending).c_str(), &table, XFS_LOAD_KEYS_ONLY) != 0)
        state.SkipWithError("load failed");
    for (auto _ : state) {
        int seen = 0;
        for (XsecHandle x = xfsXsecFind(table, "", 0.0, "", nullptr); x != nullptr; x = xfsXsecNext(table, x)) ++seen;
        if (seen != count) state.SkipWithError("walk incomplete");
    }
    state.SetItemsProcessed(state.iterations() * count);
    xfsXsecTableFree(&table);
}

}  // namespace

BENCHMARK(BM_Write)->Arg(100000)->Unit(benchmark::kMillisecond);
// Arguments: count, order (0 ascending, 1 descending, 2 random), load flags.
BENCHMARK(BM_Load)
    ->ArgNames({"n", "order", "flags"})
    ->Args({100000, Ascending, 0})
    ->Args({100000, Descending, 0})
    ->Args({100000, Ascending, XFS_LOAD_KEYS_ONLY})
    ->Args({10000, Random, 0})
    ->Args({30000, Random, 0})
    ->Args({100000, Random, 0})
    ->Unit(benchmark::kMillisecond);
// Every find makes a cursor that lives until the library is unloaded: a fixed
// number of iterations keeps the process small.
BENCHMARK(BM_Find)->Arg(10000)->Arg(100000)->Iterations(200000)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_Walk)->Arg(100000)->Unit(benchmark::kMillisecond);

BENCHMARK_MAIN();
