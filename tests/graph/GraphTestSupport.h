// Shared pieces of the graph tests: small test pipes that count what they see.
#pragma once

#include <algorithm>
#include <cstdint>

#include "kernel/Component.h"
#include "kernel/Node.h"
#include "support/WorkingImage.h"

namespace graphtest {

using Image = testsupport::WorkingImage;
using testsupport::widened;

// Counts front components alive, to prove the graph deletes what it was given.
inline int& liveComponents() {
    static int n = 0;
    return n;
}

// A pipe with a watched, serialised `mode` (0 = pass through) and a border; its Process records
// what it saw and writes a box mean of radius `radius` on every channel (a neighbourhood stage).
class TestPipe : public KERNEL::cPipe {
public:
    explicit TestPipe(int32_t border = 0, int32_t radius = 0) : border(border), radius(radius) { ++liveComponents(); }
    ~TestPipe() override { --liveComponents(); }

    void BindNode(KERNEL::__cFilterComponent__* node) override { node->BindSerialisedInt(&mode); }
    void GetBorder(int32_t& bx, int32_t& by) override {
        bx = border;
        by = border;
    }
    void Reset() override { ++resets; }
    bool ProducesOutput() override { return mode != 0; }

    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override {
        ++calls;
        seenSrcInner = src->innerRect;
        seenDstInner = dst->innerRect;
        // Only stored pixels are written, so a widened rectangle past the block's edge changes nothing.
        const int32_t x0 = std::max(dst->innerRect.x0, dst->outerRect.x0);
        const int32_t x1 = std::min(dst->innerRect.x1, dst->outerRect.x1);
        const int32_t y0 = std::max(dst->innerRect.y0, dst->outerRect.y0);
        const int32_t y1 = std::min(dst->innerRect.y1, dst->outerRect.y1);
        const int32_t n = (2 * radius + 1) * (2 * radius + 1);
        KERNEL::cPixel s, d;
        for (int32_t y = y0; y < y1; ++y) {
            dst->getPixel(d, x0, y);
            for (int32_t x = x0; x < x1; ++x) {
                int64_t sum[3] = {0, 0, 0};
                for (int32_t dy = -radius; dy <= radius; ++dy) {
                    src->getPixel(s, x - radius, y + dy);
                    for (int32_t dx = -radius; dx <= radius; ++dx) {
                        for (int k = 0; k < 3; ++k) sum[k] += s.s32(k);
                        s.right();
                    }
                }
                for (int k = 0; k < 3; ++k) d.s32(k) = int32_t(sum[k] / n) + offset;
                d.right();
            }
        }
    }

    int32_t mode = 1;
    int32_t border;
    int32_t radius;
    int32_t offset = 0;
    int calls = 0;
    int resets = 0;
    KERNEL::cRect seenSrcInner, seenDstInner;
};

}  // namespace graphtest
