// A working image (three int32 samples per stored pixel) in test memory, and blocks over it that
// own nothing; shared by the graph, step and chain tests.
#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <memory>
#include <random>
#include <vector>

#include "kernel/PixelBlock.h"

namespace testsupport {

using BlockPtr = std::unique_ptr<KERNEL::cPixelBlock>;
using Pixel3 = std::array<int32_t, 3>;

// An image at position (x, y); with sampling s it stores one pixel per s x s image pixels.
struct WorkingImage {
    int32_t width, height, x, y, sampling;
    std::vector<int32_t> samples;

    WorkingImage(int32_t w, int32_t h, int32_t x0 = 0, int32_t y0 = 0, int32_t s = 1)
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
    KERNEL::cRect rect() const { return {int16_t(x), int16_t(x + width), int16_t(y), int16_t(y + height)}; }
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

inline KERNEL::cRect widened(const KERNEL::cRect& r, int32_t bx, int32_t by) {
    return {int16_t(r.x0 - bx), int16_t(r.x1 + bx), int16_t(r.y0 - by), int16_t(r.y1 + by)};
}
inline KERNEL::cRect widened(const KERNEL::cRect& r, int32_t b) { return widened(r, b, b); }
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

}  // namespace testsupport
