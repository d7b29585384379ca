// Step 1 of the shadow chain, on Lab: chroma medians and, in some modes, smoothing across the 8x8 grid edges of L.
#pragma once

#include <cstdint>

#include "steps/StepComponent.h"

namespace KERNEL {
class cPixelBlock;
}

class cStep1 : public cStepComponent {
public:
    // (user pointer, host, value for the step frame, unused)
    cStep1(void* user, KERNEL::cHost* host, void* stepValue, void* unused);

    void BindNode(KERNEL::__cFilterComponent__* node) override;
    // Its neighbourhood reaches 10 pixels.
    void GetBorder(int32_t& bx, int32_t& by) override;
    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override;

    int32_t medianRadius1 = 4;
    int32_t medianRadius2 = 5;
    int32_t chromaLimitPercent = 75;
    int32_t edgeStrength = 100;
    int32_t medianRadius4 = 4;
    int32_t preset3 = 0;

private:
    void* user;
};
