// Step 3 of the shadow chain, on RGB: per-pixel colour grading, shifts and toned grain.
#pragma once

#include <cstdint>

#include "steps/StepComponent.h"

namespace KERNEL {
class cPixelBlock;
}

class cStep3 : public cStepComponent {
public:
    // (user pointer, host, value for the step frame, unused)
    cStep3(void* user, KERNEL::cHost* host, void* stepValue, void* unused);

    void BindNode(KERNEL::__cFilterComponent__* node) override;
    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override;

    int32_t gradeMix = 20;
    int32_t saturationPercent = 100;
    int32_t warmthPercent = 100;
    int32_t shiftStrength3 = 100;
    int32_t shiftBase3 = 100;
    int32_t shiftLevelR3 = 220;
    int32_t shiftLevelG3 = 180;
    int32_t shiftLevelB3 = 40;
    int32_t shiftStrength4 = 100;
    int32_t shiftBase4 = 100;
    int32_t shiftLevelR4 = 220;
    int32_t shiftLevelG4 = 180;
    int32_t shiftLevelB4 = 40;
    int32_t toneSelector = 0;
    int32_t toneAmount0 = 50;
    int32_t toneAmount1 = 50;
    int32_t toneAmount2 = 50;
    int32_t toneAmount3 = 50;

private:
    void* user;
};
