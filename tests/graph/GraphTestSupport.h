// Shared pieces of the graph tests: working-block images over test memory and small test pipes.
#pragma once

#include <algorithm>
#include <cstdint>
#include <random>
#include <vector>

#include "kernel/Component.h"
#include "kernel/Node.h"
#include "kernel/PixelBlock.h"

namespace graphtest {

// A 32-bit RGB image in test memory; blocks made from it wrap it without owning it.
struct Image {
    int32_t width = 0, height = 0, x = 0, y = 0;
    std::vector<int32_t> samples;

    Image(int32_t w, int32_t h, int32_t x0 = 0, int32_t y0 = 0)
        : width(w), height(h), x(x0), y(y0), samples(size_t(w) * h * 3, 0) {}
    int32_t* at(int32_t ix, int32_t iy) { return &samples[(size_t(iy - y) * width + (ix - x)) * 3]; }
    uint32_t rowBytes() const { return uint32_t(width) * 12; }

    void fillRandom(uint32_t seed, int32_t lo = 0, int32_t hi = 65535) {
        std::mt19937 rng(seed);
        std::uniform_int_distribution<int32_t> d(lo, hi);
        for (auto& s : samples) s = d(rng);
    }
    // A block over the part `outer` of this image, processing `inner`.
    KERNEL::cRGB32PixelBlock* block(const KERNEL::cRect& outer, const KERNEL::cRect& inner) {
        return new KERNEL::cRGB32PixelBlock(reinterpret_cast<uint8_t*>(at(outer.x0, outer.y0)), outer, inner, 4, 12,
                                            1, KERNEL::kModeRGB32, rowBytes());
    }
    KERNEL::cRGB32PixelBlock* block() {
        const KERNEL::cRect r{int16_t(x), int16_t(x + width), int16_t(y), int16_t(y + height)};
        return block(r, r);
    }
};

inline KERNEL::cRect widened(KERNEL::cRect r, int32_t bx, int32_t by) {
    return {int16_t(r.x0 - bx), int16_t(r.x1 + bx), int16_t(r.y0 - by), int16_t(r.y1 + by)};
}

// Counts front components alive, to prove the graph deletes what it was given.
inline int& liveComponents() {
    static int n = 0;
    return n;
}

// A pipe with a watched, serialised `mode` (0 = pass through) and a border; its Process records
// what it saw and writes a box mean of radius `radius` on every channel (a neighbourhood stage).
class TestPipe : public KERNEL::cPipe {
public:
    explicit TestPipe(int32_t border = 0, int32_t radius = 0) : border(border), radius(radius) { ++liveComponents(); }
    ~TestPipe() override { --liveComponents(); }

    void BindNode(KERNEL::__cFilterComponent__* node) override { node->BindSerialisedInt(&mode); }
    void GetBorder(int32_t& bx, int32_t& by) override {
        bx = border;
        by = border;
    }
    void Reset() override { ++resets; }
    bool ProducesOutput() override { return mode != 0; }

    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override {
        ++calls;
        seenSrcInner = src->innerRect;
        seenDstInner = dst->innerRect;
        // Only stored pixels are written, so a widened rectangle past the block's edge changes nothing.
        const int32_t x0 = std::max(dst->innerRect.x0, dst->outerRect.x0);
        const int32_t x1 = std::min(dst->innerRect.x1, dst->outerRect.x1);
        const int32_t y0 = std::max(dst->innerRect.y0, dst->outerRect.y0);
        const int32_t y1 = std::min(dst->innerRect.y1, dst->outerRect.y1);
        const int32_t n = (2 * radius + 1) * (2 * radius + 1);
        KERNEL::cPixel s, d;
        for (int32_t y = y0; y < y1; ++y) {
            dst->getPixel(d, x0, y);
            for (int32_t x = x0; x < x1; ++x) {
                int64_t sum[3] = {0, 0, 0};
                for (int32_t dy = -radius; dy <= radius; ++dy) {
                    src->getPixel(s, x - radius, y + dy);
                    for (int32_t dx = -radius; dx <= radius; ++dx) {
                        for (int k = 0; k < 3; ++k) sum[k] += s.s32(k);
                        s.right();
                    }
                }
                for (int k = 0; k < 3; ++k) d.s32(k) = int32_t(sum[k] / n) + offset;
                d.right();
            }
        }
    }

    int32_t mode = 1;
    int32_t border;
    int32_t radius;
    int32_t offset = 0;
    int calls = 0;
    int resets = 0;
    KERNEL::cRect seenSrcInner, seenDstInner;
};

}  // namespace graphtest
