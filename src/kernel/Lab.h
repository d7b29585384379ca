// The kernel's Lab: an integer opponent-colour transform of the 32-bit working block. L is a weighted
// mean (2R + 3G + B) / 6, a and b are half of R - B and G - B around 32767. Not CIE L*a*b*.
#pragma once

#include <cstdint>

#include "kernel/Component.h"

// RGB working block to Lab working block; walks the source's processing rectangle.
class cRGB2LAB : public KERNEL::cPipe {
public:
    void BindNode(KERNEL::__cFilterComponent__* node) override {}
    void GetBorder(int32_t& bx, int32_t& by) override {}
    void Reset() override {}
    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override;
};

// Lab working block back to RGB; walks the destination's processing rectangle.
class cLAB2RGB : public KERNEL::cPipe {
public:
    void BindNode(KERNEL::__cFilterComponent__* node) override {}
    void GetBorder(int32_t& bx, int32_t& by) override {}
    void Reset() override {}
    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override;
};

namespace KERNEL::lab {

inline int32_t clamp16(int64_t v) { return v < 0 ? 0 : v > 65535 ? 65535 : int32_t(v); }

// The factor 170/1024 stands for 1/6; 170, not 171, so white gives 65279.
inline void toLab(int32_t r, int32_t g, int32_t b, int32_t& L, int32_t& A, int32_t& B) {
    L = clamp16((int64_t(2) * r + int64_t(3) * g + b) * 170 >> 10);
    A = int32_t(((int64_t(r) - b) >> 1) + 32767);
    B = int32_t(((int64_t(g) - b) >> 1) + 32767);
}

// 1365/1024 and 682/1024 stand for 4/3 and 2/3; 10922 and 54612 fold in the 32767 offsets of a and
// b. Products are 64-bit: the steps may leave Lab far outside its nominal range.
inline void toRGB(int32_t L, int32_t A, int32_t B, int32_t& r, int32_t& g, int32_t& b) {
    const int64_t p = (int64_t(A) * 1365) >> 10;
    const int64_t q = (int64_t(A) * 682) >> 10;
    r = clamp16(int64_t(L) - 10922 + p - B);
    g = clamp16(int64_t(L) - 10922 + B - q);
    b = clamp16(int64_t(L) + 54612 - q - B);
}

}  // namespace KERNEL::lab
