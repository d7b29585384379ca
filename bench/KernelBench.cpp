// Hot kernels on one padded tile: 300 x 300 working pixels, processing rectangle 200 x 200 plus the
// step border.
#include <benchmark/benchmark.h>

#include <random>
#include <vector>

#include "kernel/PixelBlock.h"
#include "steps/Step2.h"
#include "support/MallocHost.h"

using namespace KERNEL;

namespace {

struct Tile {
    std::vector<int32_t> mem;
    std::unique_ptr<cRGB32PixelBlock> block;
    explicit Tile(cRect inner, uint32_t seed) : mem(300 * 300 * 3) {
        std::mt19937 rng(seed);
        std::uniform_int_distribution<int32_t> d(0, 65535);
        for (auto& v : mem) v = d(rng);
        const cRect outer{0, 300, 0, 300};
        block = std::make_unique<cRGB32PixelBlock>(reinterpret_cast<uint8_t*>(mem.data()), outer, inner, 4, 12, 1,
                                                   kModeRGB32, 300 * 12);
    }
};

const cRect kWhole{0, 300, 0, 300};
const cRect kTileCore{30, 270, 30, 270};  // 200 x 200 core widened by the border of 20

void BM_blurLarge6(benchmark::State& st) {
    testsupport::MallocHost host;
    Tile src(kWhole, 1), dst(kWhole, 2);
    for (auto _ : st) src.block->blurLarge(6.0f, dst.block.get());
    benchmark::DoNotOptimize(dst.mem.data());
}
void BM_median4(benchmark::State& st) {
    testsupport::MallocHost host;
    Tile src(kWhole, 1), dst(kWhole, 2);
    for (auto _ : st) src.block->medianFilter(4, 20, 0, 8, dst.block.get());
    benchmark::DoNotOptimize(dst.mem.data());
}
void BM_rankRange2(benchmark::State& st) {
    testsupport::MallocHost host;
    Tile src(kWhole, 1), dst(kWhole, 2);
    for (auto _ : st) src.block->rankRangeFilter(2, 10, 25, 4, 0, 8, dst.block.get());
    benchmark::DoNotOptimize(dst.mem.data());
}
void BM_step2Mode104(benchmark::State& st) {
    testsupport::MallocHost host;
    Tile src(kTileCore, 1), dst(kTileCore, 2);
    cStep2 step(nullptr, &host, nullptr, nullptr);
    step.mode = 104;
    for (auto _ : st) step.Process(src.block.get(), dst.block.get());
    benchmark::DoNotOptimize(dst.mem.data());
}

}  // namespace

BENCHMARK(BM_blurLarge6)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_median4)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_rankRange2)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_step2Mode104)->Unit(benchmark::kMillisecond);
