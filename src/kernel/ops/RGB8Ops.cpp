// Per-pixel operations of the 8-bit RGB class: invert, desaturate, boostChannel, noise, diffuse.
// Clamping is to 0..255; products that could pass 32 bits for large amounts are taken in 64 bits.
#include <cmath>
#include <cstddef>
#include <cstdlib>
#include <ctime>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

namespace KERNEL {
namespace {

template <class Fn>
void perPixel(cPixelBlock* self, cPixelBlock* d, cMargin m, Fn fn) {
    ops::cMarginScope scope({self, d}, m.dx, m.dy);
    ops::walkFrame(self, d, fn);
}

uint32_t nowSeconds() { return uint32_t(std::time(nullptr)); }

}  // namespace

void cRGBPixelBlock::invert(cPixelBlock* d, cMargin m) {
    perPixel(this, d, m, [](cPixel& a, cPixel& b, int32_t, int32_t) {
        for (int k = 0; k < 3; ++k) b.s8(k) = uint8_t(~a.s8(k));
    });
}

void cRGBPixelBlock::desaturate(cPixelBlock* d, cMargin m) {
    perPixel(this, d, m, [](cPixel& a, cPixel& b, int32_t, int32_t) {
        const uint8_t g = uint8_t((int32_t(a.s8(0)) + a.s8(1) + 2 * int32_t(a.s8(2))) >> 2);
        b.s8(0) = b.s8(1) = b.s8(2) = g;
    });
}

void cRGBPixelBlock::boostChannel(int32_t channel, uint32_t amount, cPixelBlock* d, cMargin m) {
    const int k = std::clamp(channel, 0, 2);
    const int64_t f = int64_t(double(amount) * 1.28);
    perPixel(this, d, m, [&](cPixel& a, cPixel& b, int32_t, int32_t) {
        const int64_t base = (int64_t(a.s8(1)) + a.s8(2)) * 2 >> 2;
        const int64_t delta = ((int64_t(a.s8(k)) - base) * f) >> 7;
        const uint8_t v[3] = {a.s8(0), a.s8(1), a.s8(2)};
        for (int c = 0; c < 3; ++c) b.s8(c) = ops::clamp8(v[c] + delta);
    });
}

// The ranges 4 * amount and 2 * amount are 64-bit: in 32 bits a large amount wraps to a modulus of 0.
void cRGBPixelBlock::addUniformNoise(uint32_t amount, cPixelBlock* d, cMargin m) {
    std::srand(nowSeconds() + uint32_t(innerRect.x0) + uint32_t(innerRect.y0));
    const double root = std::sqrt(double(sampling > 0 ? sampling : 1));
    const int64_t a = amount;
    perPixel(this, d, m, [&](cPixel& p, cPixel& q, int32_t, int32_t) {
        const int64_t n = a > 0 ? int64_t(double(std::rand() % (4 * a) - 2 * a) / root) : 0;
        const uint8_t v[3] = {p.s8(0), p.s8(1), p.s8(2)};
        for (int c = 0; c < 3; ++c) q.s8(c) = ops::clamp8(v[c] + n);
    });
}

void cRGBPixelBlock::addGaussianNoise(uint32_t amount, cPixelBlock* d, cMargin m) {
    std::srand(nowSeconds());
    const double root = std::sqrt(double(sampling > 0 ? sampling : 1));
    const int64_t a = amount;
    perPixel(this, d, m, [&](cPixel& p, cPixel& q, int32_t, int32_t) {
        int64_t n = 0;
        if (a > 0) {
            const int64_t r1 = std::rand(), r2 = std::rand(), r3 = std::rand();
            n = int64_t(double(r1 % (2 * a) + r2 % (2 * a) + r3 % (2 * a) - 3 * a) / root);
        }
        const uint8_t v[3] = {p.s8(0), p.s8(1), p.s8(2)};
        for (int c = 0; c < 3; ++c) q.s8(c) = ops::clamp8(v[c] + n);
    });
}

void cRGBPixelBlock::diffuse(uint32_t amount, cPixelBlock* d, cMargin m) {
    std::srand(nowSeconds());
    const int64_t a = amount;
    perPixel(this, d, m, [&](cPixel& p, cPixel& q, int32_t x, int32_t y) {
        uint8_t v[3] = {p.s8(0), p.s8(1), p.s8(2)};
        if (a > 0) {
            const int32_t off = int32_t(std::clamp<int64_t>(std::rand() % (2 * a) - a, -30000, 30000));
            cPixel o;
            getPixel(o, ops::saturate32(int64_t(x) + off), ops::saturate32(int64_t(y) + off));
            v[0] = o.s8(0);
            v[1] = o.s8(1);
            v[2] = o.s8(2);
        }
        for (int c = 0; c < 3; ++c) q.s8(c) = v[c];
    });
}

}  // namespace KERNEL
