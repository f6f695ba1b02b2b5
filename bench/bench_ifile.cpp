// Speed of the I-file layer alone: a unit read into the tools' model, and written from it. Nodes a second.
//
//   bench_ifile FILE.if [benchmark options]

#include "tools/model/ic_model.h"

#include <benchmark/benchmark.h>

#include <cstdio>
#include <memory>

namespace {

const char* path = nullptr;

long count_nodes(const IC_NODE* t) {
    long n = 0;
    for (; t; t = t->right) n += 1 + count_nodes(t->left);
    return n;
}

long count_nodes(const IC_UNIT& unit) {
    long n = 0;
    for (const IC_ITEM& item : unit.items)
        if (item.kind == IFR_EXPR) n += count_nodes(item.tree);
    return n;
}

std::unique_ptr<IC_UNIT> read_unit(TYPE_PKG& pkg) {
    tp = &pkg;
    TYPE_PKG::init_type_pkg(&pkg);
    auto unit = std::make_unique<IC_UNIT>();
    unit->read(std::fopen(path, "rb"), &pkg);
    return unit;
}

void read(benchmark::State& state) {
    long nodes = 0;
    for (auto _ : state) {
        auto pkg = std::make_unique<TYPE_PKG>();
        auto unit = read_unit(*pkg);
        state.PauseTiming();
        nodes += count_nodes(*unit);
        unit.reset();
        state.ResumeTiming();
    }
    state.SetItemsProcessed(nodes);
}
BENCHMARK(read)->Unit(benchmark::kMillisecond);

void write(benchmark::State& state) {
    TYPE_PKG pkg;
    auto unit = read_unit(pkg);
    const long nodes = count_nodes(*unit);
    for (auto _ : state) unit->write(std::fopen("/dev/null", "r+b"), &pkg, true);
    state.SetItemsProcessed(nodes * static_cast<long>(state.iterations()));
}
BENCHMARK(write)->Unit(benchmark::kMillisecond);

} // namespace

int main(int argc, char** argv) {
    if (argc < 2) {
        std::fprintf(stderr, "usage: bench_ifile FILE.if [benchmark options]\n");
        return 2;
    }
    path = argv[1];
    argv[1] = argv[0];
    --argc;
    ++argv;
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
}
