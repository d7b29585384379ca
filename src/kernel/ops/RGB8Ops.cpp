// Placeholder bodies so the kernel links while the operations are written.
#include <cstddef>

#include "kernel/PixelBlock.h"

namespace KERNEL {

void cRGBPixelBlock::invert(cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::desaturate(cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::boostChannel(int32_t channel, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::addUniformNoise(uint32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::addGaussianNoise(uint32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::diffuse(uint32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::blurKernel(double sigma, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::blurMultiScale(double sigma, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::blurLarge(float sigma, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::blur(double sigma, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::unsharpMask(int32_t radius, int32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::highPass(int32_t radius, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::edgeGradient(cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::edgeGradientGray(cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::emboss(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::embossGray(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::embossColor(double angle, float distance, uint32_t amount, cPixelBlock* d, cMargin m) {}
void cRGBPixelBlock::passThrough(int32_t argument, cMargin m) {}
void cRGBPixelBlock::fill(uint32_t c0, uint32_t c1, uint32_t c2) {}
void cRGBPixelBlock::medianFilterWorker(int32_t radius, int32_t threshold, int32_t channel, int32_t bits, cPixelBlock* d, cMargin m) {}

}  // namespace KERNEL
