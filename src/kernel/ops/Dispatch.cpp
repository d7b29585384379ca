// Placeholder bodies so the kernel links while the operations are written.
#include <cstddef>

#include "kernel/PixelBlock.h"

namespace KERNEL {

void cPixelBlock::invert(cPixelBlock* d, cMargin m) {}
void cPixelBlock::desaturate(cPixelBlock* d, cMargin m) {}
void cPixelBlock::boostChannel(int32_t channel, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::addUniformNoise(uint32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::addGaussianNoise(uint32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::diffuse(uint32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::medianFilter(int32_t radius, int32_t threshold, int32_t channel, int32_t bits, cPixelBlock* d, cMargin m) {}
void cPixelBlock::rankRangeFilter(int32_t radius, int32_t threshold, int32_t rankA, int32_t rankB, int32_t channel, int32_t bits, cPixelBlock* d, cMargin m) {}
void cPixelBlock::blurKernel(double sigma, cPixelBlock* d, cMargin m) {}
void cPixelBlock::blurMultiScale(double sigma, cPixelBlock* d, cMargin m) {}
void cPixelBlock::blurLarge(float sigma, cPixelBlock* d, cMargin m) {}
void cPixelBlock::blur(double sigma, cPixelBlock* d, cMargin m) {}
void cPixelBlock::blurAlternate(double sigma, int32_t strength, cPixelBlock* d, cMargin m) {}
void cPixelBlock::unsharpMask(int32_t radius, int32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::highPass(int32_t radius, cPixelBlock* d, cMargin m) {}
void cPixelBlock::edgeGradient(cPixelBlock* d, cMargin m) {}
void cPixelBlock::edgeGradientGray(cPixelBlock* d, cMargin m) {}
void cPixelBlock::emboss(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::embossGray(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::embossColor(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cPixelBlock::passThrough(int32_t argument, cMargin m) {}
void cPixelBlock::fill(uint32_t c0, uint32_t c1, uint32_t c2) {}

}  // namespace KERNEL
