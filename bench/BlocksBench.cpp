// Throughput of the hot block conversions and copies on a 300 x 300 tile (a 200 x 200 core with its
// 50-pixel margins): host RGB in 8 and 16 bits to and from the working block, and same-mode copies.
#include <benchmark/benchmark.h>

#include <memory>
#include <vector>

#include "kernel/PixelBlock.h"
#include "support/MallocHost.h"

using namespace KERNEL;

namespace {

constexpr int kTile = 300;

struct Pair {
    std::vector<uint8_t> source, destination;
    std::unique_ptr<cPixelBlock> from, to;

    Pair(uint16_t fromMode, uint32_t fromBps, uint32_t fromBpp, uint16_t toMode, uint32_t toBps, uint32_t toBpp)
        : source(size_t(kTile) * kTile * fromBpp), destination(size_t(kTile) * kTile * toBpp) {
        for (size_t i = 0; i < source.size(); ++i) source[i] = uint8_t(i * 31 + 7);
        from.reset(cPixelBlock::create(source.data(), kTile, kTile, fromBps, fromBpp, 0, 1, fromMode,
                                       kTile * fromBpp, 0, 0));
        to.reset(cPixelBlock::create(destination.data(), kTile, kTile, toBps, toBpp, 0, 1, toMode, kTile * toBpp, 0,
                                     0));
    }
};

void run(benchmark::State& state, Pair& p) {
    for (auto _ : state) {
        p.from->copyTo(p.to.get());
        benchmark::DoNotOptimize(p.destination.data());
        benchmark::ClobberMemory();
    }
    state.SetItemsProcessed(state.iterations() * kTile * kTile);
}

void BM_rgb8ToWorking(benchmark::State& s) {
    initModeTables();
    Pair p(kModeRGB, 1, 3, kModeRGB32, 4, 12);
    run(s, p);
}
void BM_rgb8HostPlanesToWorking(benchmark::State& s) {
    initModeTables();
    Pair p(kModeRGB, 1, 4, kModeRGB32, 4, 12);
    run(s, p);
}
void BM_rgb16ToWorking(benchmark::State& s) {
    initModeTables();
    Pair p(kModeRGB16, 2, 6, kModeRGB32, 4, 12);
    run(s, p);
}
void BM_workingToRgb8(benchmark::State& s) {
    initModeTables();
    Pair p(kModeRGB32, 4, 12, kModeRGB, 1, 3);
    run(s, p);
}
void BM_workingToRgb16(benchmark::State& s) {
    initModeTables();
    Pair p(kModeRGB32, 4, 12, kModeRGB16, 2, 6);
    run(s, p);
}
void BM_workingCopy(benchmark::State& s) {
    initModeTables();
    Pair p(kModeRGB32, 4, 12, kModeRGB32, 4, 12);
    run(s, p);
}
void BM_cloneWorking(benchmark::State& state) {
    initModeTables();
    testsupport::MallocHost host;
    Pair p(kModeRGB32, 4, 12, kModeRGB32, 4, 12);
    for (auto _ : state) {
        std::unique_ptr<cPixelBlock> copy(p.from->clone());
        benchmark::DoNotOptimize(copy.get());
    }
    state.SetItemsProcessed(state.iterations() * kTile * kTile);
}

}  // namespace

BENCHMARK(BM_rgb8ToWorking)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_rgb8HostPlanesToWorking)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_rgb16ToWorking)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_workingToRgb8)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_workingToRgb16)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_workingCopy)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_cloneWorking)->Unit(benchmark::kMicrosecond);
