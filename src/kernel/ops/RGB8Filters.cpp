// Neighbourhood filters of the 8-bit RGB class: blurMultiScale, unsharpMask, highPass, the edge
// gradients and the three emboss variants.
#include <cmath>
#include <cstddef>
#include <cstdlib>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

namespace KERNEL {
namespace {

// A blurred, locked copy of the receiver (blurLarge in place, so any radius works).
ops::BlockPtr blurredCopy(cPixelBlock* self, float radius, cMargin m) {
    ops::BlockPtr b = ops::lockedClone(self);
    b->blurLarge(radius, b.get(), m);
    return b;
}

// Offset pixel of the emboss family: walk along the direction from `distance` in steps of 0.25 until
// the rounded offset leaves the pixel (at most 64 steps beyond), so a short distance still compares
// with a neighbour.
struct cOffset {
    int32_t dx = 1, dy = 0;
    double length = 1.0;
};
cOffset embossOffset(double angle, float distance) {
    const double rad = angle * 3.14159265358979323846 / 180.0;
    double t = std::isfinite(distance) ? std::clamp(double(distance), 0.0, double(ops::kMaxRadius)) : 1.0;
    cOffset o;
    for (int i = 0; i < 64 + 4 * ops::kMaxRadius; ++i, t += 0.25) {
        const int32_t dx = int32_t(std::lround(t * std::cos(rad))), dy = int32_t(std::lround(t * std::sin(rad)));
        if (dx != 0 || dy != 0) {
            o.dx = dx;
            o.dy = dy;
            o.length = std::sqrt(double(dx) * dx + double(dy) * dy);
            return o;
        }
    }
    return o;
}

enum class Emboss { Mid, Gray, Colour };

void embossImpl(cPixelBlock* self, Emboss kind, double angle, float distance, uint32_t amount, cPixelBlock* d,
                cMargin m) {
    const cOffset o = embossOffset(angle, distance);
    const double scale = double(amount) / 100.0 / o.length;
    ops::cMarginScope scope({self, d}, m.dx, m.dy);
    ops::walkFrame(self, d, [&](cPixel& a, cPixel& b, int32_t, int32_t) {
        const uint8_t* q = ops::neighbour(a, o.dx, o.dy);
        const int64_t bps = int64_t(a.channel[1] - a.channel[0]);
        int32_t diff[3];
        for (int k = 0; k < 3; ++k) diff[k] = int32_t(a.s8(k)) - q[k * bps];
        const uint8_t v[3] = {a.s8(0), a.s8(1), a.s8(2)};
        if (kind == Emboss::Gray) {
            const uint8_t g = ops::clamp8(128 + std::lround((diff[0] + diff[1] + diff[2]) / 3.0 * scale));
            b.s8(0) = b.s8(1) = b.s8(2) = g;
            return;
        }
        for (int k = 0; k < 3; ++k)
            b.s8(k) = ops::clamp8((kind == Emboss::Mid ? 128 : v[k]) + std::lround(diff[k] * scale));
    });
}

}  // namespace

// Mean of three blurs at sigma, 2 sigma and 4 sigma: smooths small grain and broad blotches at once.
void cRGBPixelBlock::blurMultiScale(double sigma, cPixelBlock* d, cMargin m) {
    if (!ops::usable(this) || !ops::usable(d)) return;
    ops::BlockPtr b1 = ops::lockedClone(this), b2 = ops::lockedClone(this), b3 = ops::lockedClone(this);
    blur(sigma, b1.get(), m);
    blur(2 * sigma, b2.get(), m);
    blur(4 * sigma, b3.get(), m);
    ops::cMarginScope scope({this, d}, m.dx, m.dy);
    ops::cMarginScope scopeB({b1.get(), b2.get(), b3.get()}, m.dx, m.dy);
    cPixel p1, p2, p3;
    ops::walkFrame(this, d, [&](cPixel&, cPixel& q, int32_t x, int32_t y) {
        b1->getPixel(p1, x, y);
        b2->getPixel(p2, x, y);
        b3->getPixel(p3, x, y);
        for (int k = 0; k < 3; ++k) q.s8(k) = uint8_t((int32_t(p1.s8(k)) + p2.s8(k) + p3.s8(k)) / 3);
    });
}

void cRGBPixelBlock::unsharpMask(int32_t radius, int32_t amount, cPixelBlock* d, cMargin m) {
    if (!ops::usable(this) || !ops::usable(d)) return;
    ops::BlockPtr b = blurredCopy(this, float(radius), m);
    ops::cMarginScope scope({this, d}, m.dx, m.dy);
    ops::cMarginScope scopeB({b.get()}, m.dx, m.dy);
    cPixel pb;
    ops::walkFrame(this, d, [&](cPixel& a, cPixel& q, int32_t x, int32_t y) {
        b->getPixel(pb, x, y);
        const uint8_t v[3] = {a.s8(0), a.s8(1), a.s8(2)};
        for (int k = 0; k < 3; ++k)
            q.s8(k) = ops::clamp8(v[k] + (int64_t(v[k]) - pb.s8(k)) * amount / 100);
    });
}

void cRGBPixelBlock::highPass(int32_t radius, cPixelBlock* d, cMargin m) {
    if (!ops::usable(this) || !ops::usable(d)) return;
    ops::BlockPtr b = blurredCopy(this, float(radius), m);
    ops::cMarginScope scope({this, d}, m.dx, m.dy);
    ops::cMarginScope scopeB({b.get()}, m.dx, m.dy);
    cPixel pb;
    ops::walkFrame(this, d, [&](cPixel& a, cPixel& q, int32_t x, int32_t y) {
        b->getPixel(pb, x, y);
        const uint8_t v[3] = {a.s8(0), a.s8(1), a.s8(2)};
        for (int k = 0; k < 3; ++k) q.s8(k) = ops::clamp8(int32_t(v[k]) - pb.s8(k) + 128);
    });
}

// Per channel |right - here| + |below - here|; the gray form sums that over the channels.
void cRGBPixelBlock::edgeGradient(cPixelBlock* d, cMargin m) {
    ops::cMarginScope scope({this, d}, m.dx, m.dy);
    ops::walkFrame(this, d, [](cPixel& a, cPixel& b, int32_t, int32_t) {
        const uint8_t* r = ops::neighbour(a, 1, 0);
        const uint8_t* u = ops::neighbour(a, 0, 1);
        const int64_t bps = int64_t(a.channel[1] - a.channel[0]);
        int32_t g[3];
        for (int k = 0; k < 3; ++k) g[k] = std::abs(r[k * bps] - a.s8(k)) + std::abs(u[k * bps] - a.s8(k));
        for (int k = 0; k < 3; ++k) b.s8(k) = ops::clamp8(g[k]);
    });
}

void cRGBPixelBlock::edgeGradientGray(cPixelBlock* d, cMargin m) {
    ops::cMarginScope scope({this, d}, m.dx, m.dy);
    ops::walkFrame(this, d, [](cPixel& a, cPixel& b, int32_t, int32_t) {
        const uint8_t* r = ops::neighbour(a, 1, 0);
        const uint8_t* u = ops::neighbour(a, 0, 1);
        const int64_t bps = int64_t(a.channel[1] - a.channel[0]);
        int32_t g = 0;
        for (int k = 0; k < 3; ++k) g += std::abs(r[k * bps] - a.s8(k)) + std::abs(u[k * bps] - a.s8(k));
        b.s8(0) = b.s8(1) = b.s8(2) = ops::clamp8(g);
    });
}

void cRGBPixelBlock::emboss(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {
    embossImpl(this, Emboss::Mid, angle, distance, amount, d, m);
}
void cRGBPixelBlock::embossGray(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {
    embossImpl(this, Emboss::Gray, angle, distance, amount, d, m);
}
void cRGBPixelBlock::embossColor(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {
    embossImpl(this, Emboss::Colour, angle, distance, amount, d, m);
}

}  // namespace KERNEL
