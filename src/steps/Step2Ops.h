// The multi-block filters of step 2: wavelet shrinkage and the layered smoothing.
#pragma once

#include <cstdint>

namespace KERNEL {
class cPixelBlock;
}

namespace step2 {

// One level of the a-trous split on L: `out` receives the smooth part, `in`'s L the detail band
// (offset by 32000); `in`'s channel a is scratch.
void splitLevel(int32_t step, KERNEL::cPixelBlock* in, KERNEL::cPixelBlock* out);
void waveletShrink3(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, int32_t t1, int32_t t2, int32_t t3,
                    int32_t view);
void waveletShrink5(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, int32_t t1, int32_t t2, int32_t t3,
                    int32_t t4, int32_t t5, int32_t view);
void layeredSmooth(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, int32_t r1, int32_t d1, int32_t t1,
                   double sigma, int32_t r2, int32_t t2, int32_t thr2, int32_t budget, int32_t view);

}  // namespace step2
