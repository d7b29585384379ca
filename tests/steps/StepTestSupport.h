// Shared pieces of the step tests: running a step the way its node does, and a fixture that checks
// every host buffer is given back.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

#include "kernel/Component.h"
#include "kernel/Types.h"
#include "support/MallocHost.h"
#include "support/WorkingImage.h"

namespace steptest {

using testsupport::BlockPtr;
using testsupport::intersected;
using testsupport::pixelAt;
using testsupport::Pixel3;
using testsupport::storedPixel;
using testsupport::widened;
using Image = testsupport::WorkingImage;

constexpr int32_t kMin = std::numeric_limits<int32_t>::min();
constexpr int32_t kMax = std::numeric_limits<int32_t>::max();

// What a pipe node does around Process: the output starts as a locked clone of the input, and both
// inner rectangles are widened by the node's border while Process runs.
inline BlockPtr runStep(KERNEL::cPipe& step, KERNEL::cPixelBlock* src, int32_t border = 0) {
    BlockPtr dst(src->clone());
    dst->lock();
    const KERNEL::cRect srcInner = src->innerRect, dstInner = dst->innerRect;
    src->innerRect = widened(srcInner, border);
    dst->innerRect = widened(dstInner, border);
    struct Restore {
        KERNEL::cPixelBlock* s;
        KERNEL::cPixelBlock* d;
        KERNEL::cRect si, di;
        ~Restore() {
            s->innerRect = si;
            d->innerRect = di;
        }
    } restore{src, dst.get(), srcInner, dstInner};
    step.Process(src, dst.get());
    return dst;
}

// Every stored pixel of two blocks of the same geometry.
inline void expectSamePixels(const KERNEL::cPixelBlock& a, const KERNEL::cPixelBlock& b) {
    ASSERT_EQ(a.storedColumns(), b.storedColumns());
    ASSERT_EQ(a.storedRows(), b.storedRows());
    for (int32_t r = 0; r < a.storedRows(); ++r)
        for (int32_t c = 0; c < a.storedColumns(); ++c)
            ASSERT_EQ(storedPixel(a, c, r), storedPixel(b, c, r)) << "stored pixel " << c << "," << r;
}

// One pixel value through a step, on a 3 x 1 block at image row `row` filled with it; the step must
// treat every pixel of the row alike.
template <class Step>
Pixel3 runFlat(Step& step, const Pixel3& in, int32_t row = 0) {
    Image img(3, 1, 0, row);
    img.fill(in[0], in[1], in[2]);
    auto src = img.block();
    auto dst = runStep(step, src.get());
    for (int32_t x = 1; x < 3; ++x) EXPECT_EQ(pixelAt(*dst, x, row), pixelAt(*dst, 0, row)) << "pixels differ";
    return pixelAt(*dst, 0, row);
}

// A host that also counts the filter-rectangle requests.
class CountingHost : public testsupport::MallocHost {
public:
    void GetFilterRect(KERNEL::cRect& out) override {
        ++filterRectCalls;
        testsupport::MallocHost::GetFilterRect(out);
    }
    int filterRectCalls = 0;
};

class StepTest : public ::testing::Test {
protected:
    void SetUp() override { KERNEL::initModeTables(); }
    void TearDown() override { EXPECT_EQ(host.liveBuffers(), 0u) << "host buffers leaked"; }

    CountingHost host;
};

}  // namespace steptest
