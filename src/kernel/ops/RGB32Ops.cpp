// Placeholder bodies so the kernel links while the operations are written.
#include <cstddef>

#include "kernel/PixelBlock.h"

namespace KERNEL {

void cRGB32PixelBlock::invert(cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::medianFilter(int32_t radius, int32_t threshold, int32_t channel, int32_t bits, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::rankRangeFilter(int32_t radius, int32_t threshold, int32_t rankA, int32_t rankB, int32_t channel, int32_t bits, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::blurKernel(double sigma, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::blurLarge(float sigma, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::blur(double sigma, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::blurAlternate(double sigma, int32_t strength, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::fill(uint32_t c0, uint32_t c1, uint32_t c2) {}
void cRGB32PixelBlock::medianFilterWorker(int32_t radius, int32_t threshold, int32_t channel, int32_t bits, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::rankRangeFilterWorker(int32_t radius, int32_t threshold, int32_t high, int32_t low, int32_t channel, int32_t bits, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::blurAlternateKernel(double sigma, int32_t strength, cPixelBlock* d, cMargin m) {}
void cRGB32PixelBlock::blurAlternateLarge(float sigma, int32_t strength, cPixelBlock* d, cMargin m) {}

}  // namespace KERNEL
