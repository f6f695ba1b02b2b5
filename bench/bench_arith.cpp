// Speed of the target's arithmetic: 65-bit integers and simulated floats, operations a second.

#include "FPSIM/fpsim.h"
#include "XINT/int65.h"

#include <benchmark/benchmark.h>

#include <vector>

namespace {

std::vector<simul_fval> floats() {
    std::vector<simul_fval> out(256);
    for (size_t i = 0; i < out.size(); ++i) f_atof((std::to_string(i * 37 + 1) + "." + std::to_string(i * 7919)).c_str(), &out[i]);
    return out;
}

template <int (*OP)(const simul_fval*, const simul_fval*, simul_fval*)> void binary(benchmark::State& state) {
    const std::vector<simul_fval> v = floats();
    simul_fval r;
    size_t i = 0;
    for (auto _ : state) {
        OP(&v[i & 255], &v[(i * 7 + 3) & 255], &r);
        benchmark::DoNotOptimize(r);
        ++i;
    }
    state.SetItemsProcessed(static_cast<long>(state.iterations()));
}
BENCHMARK(binary<f_add>)->Name("f_add");
BENCHMARK(binary<f_mul>)->Name("f_mul");
BENCHMARK(binary<f_div>)->Name("f_div");

void text(benchmark::State& state) {
    simul_fval r;
    for (auto _ : state) {
        f_atof("3.14159265358979323846e-7", &r);
        benchmark::DoNotOptimize(r);
    }
}
BENCHMARK(text)->Name("f_atof");

template <class OP> void integers(benchmark::State& state, OP op) {
    INT65 a(0x123456789ABCDEFLL), b(977);
    for (auto _ : state) {
        benchmark::DoNotOptimize(a);
        benchmark::DoNotOptimize(op(a, b));
    }
}
void add(benchmark::State& s) { integers(s, [](INT65 a, INT65 b) { return a + b; }); }
void multiply(benchmark::State& s) { integers(s, [](INT65 a, INT65 b) { return a * b; }); }
void divide(benchmark::State& s) { integers(s, [](INT65 a, INT65 b) { return a / b; }); }
BENCHMARK(add)->Name("INT65 +");
BENCHMARK(multiply)->Name("INT65 *");
BENCHMARK(divide)->Name("INT65 /");

} // namespace

BENCHMARK_MAIN();
