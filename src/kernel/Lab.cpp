#include "kernel/Lab.h"

#include <cstddef>

#include "kernel/PixelBlock.h"
#include "kernel/StageTimer.h"

namespace {

using KERNEL::cPixel;
using KERNEL::cPixelBlock;

// Pixels a row of [x0, x1) visits when it steps by `sampling`.
int32_t stepsInRow(int32_t x0, int32_t x1, int32_t sampling) {
    if (x1 <= x0 || sampling <= 0) return 0;
    return (x1 - x0 + sampling - 1) / sampling;
}

// Converts one row of `count` pixels. When both cursors run over stored pixels without repeating an
// edge, the row is a plain strided loop the compiler can vectorise; otherwise the cursors walk it.
template <typename Convert>
void convertRow(cPixel s, cPixel d, int32_t count, Convert convert) {
    const bool plain = s.clampLeft == 0 && d.clampLeft == 0 && s.columnsLeft >= uint32_t(count) &&
                       d.columnsLeft >= uint32_t(count) && s.pixelStep == 12 && d.pixelStep == 12 &&
                       s.channel[1] == s.channel[0] + 4 && d.channel[1] == d.channel[0] + 4;
    if (plain) {
        const int32_t* in = reinterpret_cast<const int32_t*>(s.channel[0]);
        int32_t* out = reinterpret_cast<int32_t*>(d.channel[0]);
        if (in == out) {
            for (int32_t i = 0; i < count; ++i) {
                int32_t o0, o1, o2;
                convert(in[3 * i], in[3 * i + 1], in[3 * i + 2], o0, o1, o2);
                out[3 * i] = o0;
                out[3 * i + 1] = o1;
                out[3 * i + 2] = o2;
            }
        } else {
            const int32_t* __restrict src = in;
            int32_t* __restrict dst = out;
            for (int32_t i = 0; i < count; ++i)
                convert(src[3 * i], src[3 * i + 1], src[3 * i + 2], dst[3 * i], dst[3 * i + 1], dst[3 * i + 2]);
        }
        return;
    }
    for (int32_t i = 0; i < count; ++i) {
        int32_t o0, o1, o2;
        convert(s.s32(0), s.s32(1), s.s32(2), o0, o1, o2);
        d.s32(0) = o0;
        d.s32(1) = o1;
        d.s32(2) = o2;
        s.right();
        d.right();
    }
}

template <typename Convert>
void convertBlock(cPixelBlock* src, cPixelBlock* dst, const KERNEL::cRect& walk, int32_t sampling,
                  Convert convert) {
    const int32_t count = stepsInRow(walk.x0, walk.x1, sampling);
    if (count == 0 || src->data == nullptr || dst->data == nullptr) return;
    cPixel s, d;
    for (int32_t y = walk.y0; y < walk.y1; y += sampling) {
        src->getPixel(s, src->innerRect.x0, y);
        dst->getPixel(d, dst->innerRect.x0, y);
        convertRow(s, d, count, convert);
    }
}

}  // namespace

void cRGB2LAB::Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) {
    KERNEL::timing::cStageClock clock(KERNEL::timing::kLab);
    convertBlock(src, dst, src->innerRect, src->sampling,
                 [](int32_t r, int32_t g, int32_t b, int32_t& L, int32_t& A, int32_t& B) {
                     KERNEL::lab::toLab(r, g, b, L, A, B);
                 });
}

void cLAB2RGB::Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) {
    KERNEL::timing::cStageClock clock(KERNEL::timing::kLabBack);
    convertBlock(src, dst, dst->innerRect, dst->sampling,
                 [](int32_t L, int32_t A, int32_t B, int32_t& r, int32_t& g, int32_t& b) {
                     KERNEL::lab::toRGB(L, A, B, r, g, b);
                 });
}
