// Blur dispatchers and the base-class behaviour: an operation that only the 8-bit RGB class
// implements runs there on a temporary 8-bit copy of the receiver, destroyed also on exceptions.
#include <cstddef>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

namespace KERNEL {
namespace {

template <class Op>
void throughRGB(cPixelBlock* self, Op op) {
    ops::BlockPtr copy(self->convertedTo(kModeRGB));
    if (!copy) return;
    copy->lock();
    op(copy.get());
}

}  // namespace

void cRGB32PixelBlock::blur(double sigma, cPixelBlock* destination, cMargin margin) {
    if (sigma < 0.2)
        blurKernel(0.2, destination, margin);
    else if (sigma < 2.5)
        blurKernel(sigma, destination, margin);
    else
        blurLarge(float(sigma), destination, margin);
}

void cRGBPixelBlock::blur(double sigma, cPixelBlock* destination, cMargin margin) {
    if (sigma >= 2.5) {
        blurLarge(float(sigma), destination, margin);
        return;
    }
    const double s = (sigma > 0.2 ? sigma : 0.2) * 1.6;
    double k = s - 0.1;
    if (s > 1.5) k += 0.1;
    if (s > 1.8) k += 0.1;
    if (s > 2.1) k += 0.1;
    blurKernel(k, destination, margin);
}

void cPixelBlock::invert(cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->invert(d, m); });
}
void cPixelBlock::desaturate(cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->desaturate(d, m); });
}
void cPixelBlock::boostChannel(int32_t channel, uint32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->boostChannel(channel, amount, d, m); });
}
void cPixelBlock::addUniformNoise(uint32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->addUniformNoise(amount, d, m); });
}
void cPixelBlock::addGaussianNoise(uint32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->addGaussianNoise(amount, d, m); });
}
void cPixelBlock::diffuse(uint32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->diffuse(amount, d, m); });
}
// No class but the working one filters by median; elsewhere it runs the 8-bit worker on the copy
// with the same radius rule.
void cPixelBlock::medianFilter(int32_t radius, int32_t threshold, int32_t channel, int32_t bits, cPixelBlock* d,
                               cMargin m) {
    if (sampling <= 0 || radius / sampling < 1) return;
    throughRGB(this, [&](cPixelBlock* c) {
        static_cast<cRGBPixelBlock*>(c)->medianFilterWorker(radius, threshold, channel, bits, d, m);
    });
}
void cPixelBlock::rankRangeFilter(int32_t, int32_t, int32_t, int32_t, int32_t, int32_t, cPixelBlock*, cMargin) {}
void cPixelBlock::blurKernel(double sigma, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->blurKernel(sigma, d, m); });
}
void cPixelBlock::blurMultiScale(double sigma, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->blurMultiScale(sigma, d, m); });
}
void cPixelBlock::blurLarge(float sigma, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->blurLarge(sigma, d, m); });
}
void cPixelBlock::blur(double sigma, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->blur(sigma, d, m); });
}
// Only the working class blurs with a strength; other classes leave the destination alone.
void cPixelBlock::blurAlternate(double, int32_t, cPixelBlock*, cMargin) {}
void cPixelBlock::unsharpMask(int32_t radius, int32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->unsharpMask(radius, amount, d, m); });
}
void cPixelBlock::highPass(int32_t radius, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->highPass(radius, d, m); });
}
void cPixelBlock::edgeGradient(cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->edgeGradient(d, m); });
}
void cPixelBlock::edgeGradientGray(cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->edgeGradientGray(d, m); });
}
void cPixelBlock::emboss(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->emboss(angle, distance, amount, d, m); });
}
void cPixelBlock::embossGray(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->embossGray(angle, distance, amount, d, m); });
}
void cPixelBlock::embossColor(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->embossColor(angle, distance, amount, d, m); });
}
void cPixelBlock::passThrough(int32_t argument, cMargin m) {
    throughRGB(this, [&](cPixelBlock* c) { c->passThrough(argument, m); });
}
void cPixelBlock::fill(uint32_t, uint32_t, uint32_t) {}

}  // namespace KERNEL
