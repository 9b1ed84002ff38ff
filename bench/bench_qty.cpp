// Throughput of the unit library's in-place array conversions and of single
// value conversions. Each array iteration converts there and back so that the
// values stay in range; items/s counts converted values.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <vector>

#include "qty/qty.h"

namespace {

int32_t unitKey(const char* text) {
    int32_t key = -1;
    qtyGetUnitTag(text, &key);
    return key;
}

template <class T, int (*Convert)(int32_t, int32_t, T*, int32_t, T)>
void convertArray(benchmark::State& state, const char* from, const char* to, T deleteValue) {
    const int32_t a = unitKey(from);
    const int32_t b = unitKey(to);
    std::vector<T> values(static_cast<size_t>(state.range(0)));
    for (size_t i = 0; i < values.size(); ++i) values[i] = i % 97 == 0 ? deleteValue : static_cast<T>(i % 1000);
    const auto n = static_cast<int32_t>(values.size());
    for (auto _ : state) {
        Convert(a, b, values.data(), n, deleteValue);
        Convert(b, a, values.data(), n, deleteValue);
        benchmark::DoNotOptimize(values.data());
        benchmark::ClobberMemory();
    }
    state.SetItemsProcessed(state.iterations() * 2 * state.range(0));
    state.SetBytesProcessed(state.iterations() * 2 * state.range(0) * static_cast<int64_t>(sizeof(T)));
}

void ArrayD_Linear_m_ft(benchmark::State& s) { convertArray<double, qtyConvertItemArrayD>(s, "m", "ft", -1e-255); }
void ArrayD_Affine_degC_degF(benchmark::State& s) {
    convertArray<double, qtyConvertItemArrayD>(s, "degC", "degF", -1e-255);
}
void ArrayF_Linear_m_ft(benchmark::State& s) { convertArray<float, qtyConvertItemArrayF>(s, "m", "ft", -1e-35f); }
void ArrayF_Affine_degC_degF(benchmark::State& s) {
    convertArray<float, qtyConvertItemArrayF>(s, "degC", "degF", -1e-35f);
}

// 4 Ki values: L1 resident; 64 Ki: L2; 4 Mi: main memory.
#define QTY_ARRAY_SIZES Arg(4 << 10)->Arg(64 << 10)->Arg(4 << 20)
BENCHMARK(ArrayD_Linear_m_ft)->QTY_ARRAY_SIZES;
BENCHMARK(ArrayD_Affine_degC_degF)->QTY_ARRAY_SIZES;
BENCHMARK(ArrayF_Linear_m_ft)->QTY_ARRAY_SIZES;
BENCHMARK(ArrayF_Affine_degC_degF)->QTY_ARRAY_SIZES;

void ScalarConvertUnit(benchmark::State& state) {
    const int32_t knot = unitKey("knot");
    const int32_t kmh = unitKey("km/h");
    double v = 1.0;
    for (auto _ : state) {
        qtyConvertUnit(knot, v, kmh, &v);
        qtyConvertUnit(kmh, v, knot, &v);
        benchmark::DoNotOptimize(v);
    }
    state.SetItemsProcessed(state.iterations() * 2);
}
BENCHMARK(ScalarConvertUnit);

}  // namespace
