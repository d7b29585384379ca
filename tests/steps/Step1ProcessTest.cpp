// Step 1: copy modes, the chroma median with its limits and presets, the grid edge smoothing with
// its thresholds and write order, the speck pass, tiling seams and the working copies' lifetime.
#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>

#include "kernel/Memory/MEM.h"
#include "steps/Step1.h"
#include "steps/StepTestSupport.h"

using namespace steptest;
using KERNEL::cRect;

namespace {

constexpr int32_t kL = 0, kA = 1, kB = 2;

class Step1Test : public StepTest {
protected:
    cStep1 step{nullptr, &host, nullptr, nullptr};
};

// An L image of 16 pixels across bands of the given L values (rows, or columns when turned), with
// neutral-ish chroma.
Image banded(const std::vector<int32_t>& bands, bool turned = false) {
    const int32_t n = int32_t(bands.size());
    Image img(turned ? n : 16, turned ? 16 : n);
    for (int32_t y = 0; y < img.height; ++y)
        for (int32_t x = 0; x < img.width; ++x) {
            int32_t* p = img.at(x, y);
            p[kL] = bands[size_t(turned ? x : y)];
            p[kA] = p[kB] = 32767;
        }
    return img;
}

// Mode 4 over banded L: the output L of every band, which must be the same all along the band.
std::vector<int32_t> bandsAfter(cStep1& step, const std::vector<int32_t>& bands, bool turned, int32_t border) {
    Image img = banded(bands, turned);
    auto src = img.block();
    auto dst = runStep(step, src.get(), border);
    std::vector<int32_t> out;
    for (int32_t i = 0; i < int32_t(bands.size()); ++i) {
        out.push_back(pixelAt(*dst, turned ? i : 0, turned ? 0 : i)[kL]);
        for (int32_t j = 0; j < 16; ++j) EXPECT_EQ(pixelAt(*dst, turned ? i : j, turned ? j : i)[kL], out.back()) << i;
    }
    return out;
}

std::vector<int32_t> cellsOf(int32_t count, const std::function<int32_t(int32_t)>& value) {
    std::vector<int32_t> v(static_cast<size_t>(count));
    for (int32_t i = 0; i < count; ++i) v[size_t(i)] = value(i);
    return v;
}

}  // namespace

// Flat planes stay flat; neutral chroma lands on the lower edge of its 256-wide median bin.
TEST_F(Step1Test, MedianModesOnFlatPlanes) {
    struct Case {
        int32_t mode, preset3;
    };
    for (Case c : {Case{1, 0}, {2, 0}, {3, 0}, {3, 1}, {3, 2}, {3, 3}, {3, 4}, {4, 0}, {102, 0}, {105, 0}, {kMax, 0}}) {
        SCOPED_TRACE(testing::Message() << "mode " << c.mode << " preset " << c.preset3);
        Image img(32, 24);
        img.fill(20000, 32767, 32767);
        step.mode = c.mode;
        step.preset3 = c.preset3;
        auto src = img.block();
        auto dst = runStep(step, src.get(), 10);
        for (int32_t y = 0; y < 24; ++y)
            for (int32_t x = 0; x < 32; ++x) ASSERT_EQ(pixelAt(*dst, x, y), (Pixel3{20000, 32512, 32512})) << x << "," << y;
    }
}

// The merge rule against the kernel's own median: out = median, unless the input lies at least
// `limit` away, then input -/+ limit. Mode 1 never limits.
TEST_F(Step1Test, ChromaMedianFollowsRadiusAndLimitTable) {
    struct Case {
        int32_t mode, preset3, radius, limit;  // limit -1: none
    };
    const Case cases[] = {{1, 0, 4, -1},     {2, 0, 5, 3200},   {3, 0, 3, 640},   {3, 1, 4, 1280},
                          {3, 2, 6, 2560},   {3, 3, 9, 4480},   {3, 4, 4, 2560},  {4, 0, 4, 2560},
                          {100 + 2, 0, 8, 2560}, {150, 0, 8, 2560}};
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << "mode " << c.mode << " preset " << c.preset3);
        Image img(40, 36);
        img.fillRandom(uint32_t(c.mode * 10 + c.preset3));
        step.mode = c.mode;
        step.preset3 = c.preset3;
        step.chromaLimitPercent = c.mode == 1 ? 100 : 75;  // mode 1 ignores it
        auto src = img.block(cRect{0, 40, 0, 36});

        BlockPtr median(src->clone());
        median->lock();
        src->medianFilter(c.radius, 255, kA, 8, median.get());
        src->medianFilter(c.radius, 255, kB, 8, median.get());
        auto dst = runStep(step, src.get());

        int limited = 0;
        for (int32_t y = 0; y < 36; ++y)
            for (int32_t x = 0; x < 40; ++x) {
                const Pixel3 in = pixelAt(*src, x, y), med = pixelAt(*median, x, y), out = pixelAt(*dst, x, y);
                if (c.mode != 4 && !(c.mode == 3 && c.preset3 == 4)) {
                    ASSERT_EQ(out[kL], in[kL]);
                }
                for (int k : {kA, kB}) {
                    int32_t want = med[k];
                    if (c.limit >= 0 && std::abs(in[k] - med[k]) >= c.limit) {
                        want = in[k] > med[k] ? in[k] - c.limit : in[k] + c.limit;
                        ++limited;
                    }
                    ASSERT_EQ(out[k], want) << x << "," << y << "," << k;
                }
            }
        if (c.limit >= 0) {
            EXPECT_GT(limited, 0) << "the limit never applied";
        }
    }
}

// L = V above the edge between rows 7 and 8 and V + 1000 below it, in both orientations. With 17
// bands the last cell holds one band: its top edge reads a and b from that same clamped band, and
// b's value, written last, stays.
TEST_F(Step1Test, GridEdgeBetweenRowsAndBetweenColumns) {
    step.mode = 4;
    for (bool turned : {false, true}) {
        SCOPED_TRACE(turned ? "columns" : "rows");
        for (int32_t v : {0, 20000}) {
            const auto out = bandsAfter(step, cellsOf(24, [v](int32_t i) { return i < 8 ? v : v + 1000; }), turned, 10);
            EXPECT_EQ(std::vector<int32_t>(out.begin(), out.begin() + 12),
                      (std::vector<int32_t>{v, v, v, v, v, v, v + 111, v + 333, v + 666, v + 888, v + 1000, v + 1000}));
        }
        const int32_t v = 5000;
        const auto out = bandsAfter(step, cellsOf(17, [v](int32_t i) { return i < 16 ? v : v + 1000; }), turned, 0);
        EXPECT_EQ(std::vector<int32_t>(out.end() - 3, out.end()), (std::vector<int32_t>{v + 111, v + 333, v + 888}));
    }
}

// a = 10000 next to the edge, b = 16000 inward, c = 20000 across: |a - b| = 6000 sits exactly on the
// lower threshold at strength 100, so only a moves; a hair more strength blends both; a fifth of
// it does nothing. Thresholds come from 64-bit products, so the extremes behave like large/small.
// Where the edge stays, the speck pass raises row 7 (2500 above its neighbours' mean) by 625. The
// two edge columns are left out: positions beyond the image repeat them, and each repeat sees the
// already raised value.
TEST_F(Step1Test, EdgeStrengthThresholds) {
    struct Case {
        int32_t mode, preset3, strength, row7, row8, row9;
    };
    const Case cases[] = {
        {4, 0, 100, 20000, 12500, 16000},   {4, 0, 101, 20000, 14333, 15777}, {4, 0, 20, 20625, 10000, 16000},
        {4, 0, kMax, 20000, 14333, 15777},  {4, 0, kMin, 20625, 10000, 16000}, {4, 0, 0, 20625, 10000, 16000},
        {105, 0, 101, 20000, 14333, 15777}, {3, 4, 20, 20000, 12500, 16000},  // preset 4: always strength 100
        {3, 3, 101, 20000, 10000, 16000},   // other presets: neither smoothing nor specks
    };
    const auto bands = cellsOf(24, [](int32_t i) { return i < 8 ? 20000 : (i == 8 ? 10000 : 16000); });
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << "mode " << c.mode << " strength " << c.strength);
        step.mode = c.mode;
        step.preset3 = c.preset3;
        step.edgeStrength = c.strength;
        Image img = banded(bands);
        auto src = img.block();
        auto dst = runStep(step, src.get(), 10);
        for (int32_t x = 1; x < 15; ++x) {
            ASSERT_EQ(pixelAt(*dst, x, 6)[kL], 20000);
            ASSERT_EQ(pixelAt(*dst, x, 7)[kL], c.row7);
            ASSERT_EQ(pixelAt(*dst, x, 8)[kL], c.row8);
            ASSERT_EQ(pixelAt(*dst, x, 9)[kL], c.row9);
        }
    }
}

// One pixel inside a cell above four equal neighbours: raised by a quarter of its lead when the
// lead is 2001..19999, else kept. At sampling 2 the grid passes are skipped but the speck pass
// still tests every stored pixel against its stored neighbours.
TEST_F(Step1Test, SpeckPass) {
    struct Case {
        int32_t bump, want;
    };
    const int32_t v = 20000;
    const Case cases[] = {{3000, v + 3750}, {2000, v + 2000}, {2001, v + 2501},  {19999, v + 24998},
                          {20000, v + 20000}, {-3000, v - 3000}, {1000, v + 1000}};
    for (int32_t sampling : {1, 2}) {
        for (const Case& c : cases) {
            SCOPED_TRACE(testing::Message() << "sampling " << sampling << " bump " << c.bump);
            Image img(32, 32, 0, 0, sampling);
            img.fill(v, 32767, 32767);
            img.stored(3, 4)[kL] = v + c.bump;
            step.mode = 4;
            auto src = img.block();
            auto dst = runStep(step, src.get(), 10);
            for (int32_t r = 0; r < img.rows(); ++r)
                for (int32_t col = 0; col < img.columns(); ++col)
                    ASSERT_EQ(storedPixel(*dst, col, r)[kL], (col == 3 && r == 4) ? c.want : v) << col << "," << r;
        }
    }
}

TEST_F(Step1Test, SubsampledBlockSkipsTheGridPasses) {
    // A 1000 step between stored rows 3 and 4 (image rows 6 and 8 at sampling 2) is not a grid edge
    // at this resolution and must stay sharp.
    Image img(32, 32, 0, 0, 2);
    for (int32_t r = 0; r < 16; ++r)
        for (int32_t c = 0; c < 16; ++c) {
            int32_t* p = img.stored(c, r);
            p[kL] = r < 4 ? 7000 : 8000;
            p[kA] = p[kB] = 32767;
        }
    step.mode = 4;
    auto src = img.block();
    auto dst = runStep(step, src.get(), 10);
    for (int32_t r = 0; r < 16; ++r)
        for (int32_t c = 0; c < 16; ++c) ASSERT_EQ(storedPixel(*dst, c, r)[kL], r < 4 ? 7000 : 8000);
}

// The grid is anchored at image coordinate 0, so tiles that start off the grid and see only part of
// their cells still agree with the whole image on their cores.
TEST_F(Step1Test, TilesAgreeWithTheWholeImage) {
    const int32_t W = 61, H = 53;
    Image img(W, H);
    std::mt19937 rng(77);
    std::uniform_int_distribution<int32_t> base(8000, 40000), noise(0, 40), chroma(20000, 45000), pick(0, 60);
    std::vector<int32_t> cellBase(size_t((W / 8 + 1) * (H / 8 + 1)));
    for (auto& b : cellBase) b = base(rng);
    for (int32_t y = 0; y < H; ++y)
        for (int32_t x = 0; x < W; ++x) {
            int32_t* p = img.at(x, y);
            p[kL] = cellBase[size_t((y / 8) * (W / 8 + 1) + x / 8)] + noise(rng) + (pick(rng) == 0 ? 3000 : 0);
            p[kA] = chroma(rng);
            p[kB] = chroma(rng);
        }

    struct Case {
        int32_t mode, preset3, strength;
    };
    for (Case c : {Case{4, 0, 100}, {105, 0, 400}, {3, 4, 0}, {4, 0, 5}}) {
        step.mode = c.mode;
        step.preset3 = c.preset3;
        step.edgeStrength = c.strength;
        auto whole = img.block();
        auto reference = runStep(step, whole.get(), 10);

        int touched = 0;
        for (int32_t y = 0; y < H; ++y)
            for (int32_t x = 0; x < W; ++x) touched += pixelAt(*reference, x, y)[kL] != img.at(x, y)[kL];
        ASSERT_GT(touched, 50) << "the grid passes did nothing on this picture";

        for (int32_t margin : {10, 13, 50}) {
            SCOPED_TRACE(testing::Message() << "mode " << c.mode << " margin " << margin);
            for (int32_t ty = 0; ty < H; ty += 11)
                for (int32_t tx = 0; tx < W; tx += 13) {
                    const cRect core{int16_t(tx), int16_t(std::min(tx + 13, W)), int16_t(ty),
                                     int16_t(std::min(ty + 11, H))};
                    const cRect outer = intersected(widened(core, margin), img.rect());
                    auto tile = img.block(outer, core);
                    auto out = runStep(step, tile.get(), 10);
                    for (int32_t y = core.y0; y < core.y1; ++y)
                        for (int32_t x = core.x0; x < core.x1; ++x)
                            ASSERT_EQ(pixelAt(*out, x, y), pixelAt(*reference, x, y))
                                << "tile " << tx << "," << ty << " pixel " << x << "," << y;
                }
        }
    }
}

TEST_F(Step1Test, WorkingCopiesAreReleasedWhenAllocationFails) {
    Image img(16, 16);
    img.fillRandom(3);
    step.mode = 4;
    auto src = img.block();
    BlockPtr dst(src->clone());
    dst->lock();
    // The destination took allocation 1; the second working copy fails.
    host.failAllocationAt = host.allocations + 2;
    EXPECT_THROW(step.Process(src.get(), dst.get()), KERNEL::cMEMException);
    EXPECT_EQ(host.liveBuffers(), 1u);
}
