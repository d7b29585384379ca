// The pixel cursor: three channel pointers plus the counters that make it repeat the edge pixel
// when it is asked for, or moved to, a position outside the stored rectangle.
#pragma once

#include <cstdint>

namespace KERNEL {

struct cPixel {
    uint8_t* channel[3] = {nullptr, nullptr, nullptr};
    uint32_t pixelStep = 0;
    uint32_t rowStep = 0;
    uint32_t column = 0;
    uint32_t columnsLeft = 0;  // including the current one
    uint32_t row = 0;
    uint32_t rowsLeft = 0;     // including the current one
    uint32_t clampTop = 0;
    uint32_t clampBottom = 0;
    uint32_t clampLeft = 0;
    uint32_t clampRight = 0;

    // One stored pixel to the right: stays on the last column, and first pays off any columns it
    // owed from a start left of the block.
    void right() {
        if (columnsLeft == 1) return;
        if (clampLeft != 0) {
            --clampLeft;
            return;
        }
        channel[0] += pixelStep;
        channel[1] += pixelStep;
        channel[2] += pixelStep;
        ++column;
        --columnsLeft;
    }
    // One stored pixel down, with the same rule on rows.
    void down() {
        if (rowsLeft == 1) return;
        if (clampTop != 0) {
            --clampTop;
            return;
        }
        channel[0] += rowStep;
        channel[1] += rowStep;
        channel[2] += rowStep;
        ++row;
        --rowsLeft;
    }

    // Typed access to the current pixel's samples.
    int32_t& s32(int k) const { return *reinterpret_cast<int32_t*>(channel[k]); }
    uint16_t& s16(int k) const { return *reinterpret_cast<uint16_t*>(channel[k]); }
    uint8_t& s8(int k) const { return *channel[k]; }
};

}  // namespace KERNEL
