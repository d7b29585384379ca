// Shared pieces of the step tests: working-block images in test memory, running a step the way its
// node does, and a fixture that checks every host buffer is given back.
#pragma once

#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <limits>
#include <memory>
#include <random>
#include <vector>

#include "kernel/Component.h"
#include "kernel/PixelBlock.h"
#include "kernel/Types.h"
#include "support/MallocHost.h"

namespace steptest {

using BlockPtr = std::unique_ptr<KERNEL::cPixelBlock>;
using Pixel3 = std::array<int32_t, 3>;

constexpr int32_t kMin = std::numeric_limits<int32_t>::min();
constexpr int32_t kMax = std::numeric_limits<int32_t>::max();

// A working image (three int32 per stored pixel) at image position (x, y); with sampling s it stores
// one pixel per s x s image pixels. Blocks made from it wrap it and own nothing.
struct Image {
    int32_t width, height, x, y, sampling;
    std::vector<int32_t> samples;

    Image(int32_t w, int32_t h, int32_t x0 = 0, int32_t y0 = 0, int32_t s = 1)
        : width(w), height(h), x(x0), y(y0), sampling(s), samples(size_t(w / s) * size_t(h / s) * 3, 0) {}

    int32_t columns() const { return width / sampling; }
    int32_t rows() const { return height / sampling; }
    // Stored pixel (column, row), counted from the image's own corner.
    int32_t* stored(int32_t c, int32_t r) { return &samples[(size_t(r) * size_t(columns()) + size_t(c)) * 3]; }
    // Pixel at full-resolution image position (only for sampling 1).
    int32_t* at(int32_t ix, int32_t iy) { return stored(ix - x, iy - y); }
    uint32_t rowBytes() const { return uint32_t(columns()) * 12; }

    void fill(int32_t c0, int32_t c1, int32_t c2) {
        for (size_t i = 0; i < samples.size(); i += 3) {
            samples[i] = c0;
            samples[i + 1] = c1;
            samples[i + 2] = c2;
        }
    }
    void fillRandom(uint32_t seed, int32_t lo = 0, int32_t hi = 65535) {
        std::mt19937 rng(seed);
        std::uniform_int_distribution<int32_t> d(lo, hi);
        for (auto& s : samples) s = d(rng);
    }
    KERNEL::cRect rect() const {
        return {int16_t(x), int16_t(x + width), int16_t(y), int16_t(y + height)};
    }
    // A block over the part `outer` of this image (sampling 1), processing `inner`.
    BlockPtr block(const KERNEL::cRect& outer, const KERNEL::cRect& inner) {
        return BlockPtr(new KERNEL::cRGB32PixelBlock(reinterpret_cast<uint8_t*>(at(outer.x0, outer.y0)), outer, inner,
                                                     4, 12, 1, KERNEL::kModeRGB32, rowBytes()));
    }
    // A block over the whole image, processing `inner` (any sampling).
    BlockPtr block(const KERNEL::cRect& inner) {
        return BlockPtr(new KERNEL::cRGB32PixelBlock(reinterpret_cast<uint8_t*>(samples.data()), rect(), inner, 4,
                                                     12, sampling, KERNEL::kModeRGB32, rowBytes()));
    }
    BlockPtr block() { return block(rect()); }
};

inline KERNEL::cRect widened(const KERNEL::cRect& r, int32_t b) {
    return {int16_t(r.x0 - b), int16_t(r.x1 + b), int16_t(r.y0 - b), int16_t(r.y1 + b)};
}
inline KERNEL::cRect intersected(const KERNEL::cRect& a, const KERNEL::cRect& b) {
    return {std::max(a.x0, b.x0), std::min(a.x1, b.x1), std::max(a.y0, b.y0), std::min(a.y1, b.y1)};
}

// Stored pixel (column, row) of any working block.
inline Pixel3 storedPixel(const KERNEL::cPixelBlock& b, int32_t c, int32_t r) {
    const auto* p = reinterpret_cast<const int32_t*>(b.data + size_t(r) * b.rowBytes + size_t(c) * b.bytesPerPixel);
    return {p[0], p[1], p[2]};
}
// Pixel at image position (x, y) of a full-resolution block.
inline Pixel3 pixelAt(const KERNEL::cPixelBlock& b, int32_t x, int32_t y) {
    return storedPixel(b, x - b.outerRect.x0, y - b.outerRect.y0);
}

// What a pipe node does around Process: the output starts as a locked clone of the input, and both
// inner rectangles are widened by the node's border while Process runs.
inline BlockPtr runStep(KERNEL::cPipe& step, KERNEL::cPixelBlock* src, int32_t border = 0) {
    BlockPtr dst(src->clone());
    dst->lock();
    const KERNEL::cRect srcInner = src->innerRect, dstInner = dst->innerRect;
    src->innerRect = widened(srcInner, border);
    dst->innerRect = widened(dstInner, border);
    struct Restore {
        KERNEL::cPixelBlock* s;
        KERNEL::cPixelBlock* d;
        KERNEL::cRect si, di;
        ~Restore() {
            s->innerRect = si;
            d->innerRect = di;
        }
    } restore{src, dst.get(), srcInner, dstInner};
    step.Process(src, dst.get());
    return dst;
}

// Every stored pixel of two blocks of the same geometry.
inline void expectSamePixels(const KERNEL::cPixelBlock& a, const KERNEL::cPixelBlock& b) {
    ASSERT_EQ(a.storedColumns(), b.storedColumns());
    ASSERT_EQ(a.storedRows(), b.storedRows());
    for (int32_t r = 0; r < a.storedRows(); ++r)
        for (int32_t c = 0; c < a.storedColumns(); ++c)
            ASSERT_EQ(storedPixel(a, c, r), storedPixel(b, c, r)) << "stored pixel " << c << "," << r;
}

// A host that also counts the filter-rectangle requests.
class CountingHost : public testsupport::MallocHost {
public:
    void GetFilterRect(KERNEL::cRect& out) override {
        ++filterRectCalls;
        testsupport::MallocHost::GetFilterRect(out);
    }
    int filterRectCalls = 0;
};

class StepTest : public ::testing::Test {
protected:
    void SetUp() override { KERNEL::initModeTables(); }
    void TearDown() override { EXPECT_EQ(host.liveBuffers(), 0u) << "host buffers leaked"; }

    CountingHost host;
};

}  // namespace steptest
