// Step 4 of the shadow chain, on RGB: per-pixel levels, tone curves and grain.
#pragma once

#include <cstdint>

#include "steps/StepComponent.h"

namespace KERNEL {
class cPixelBlock;
}

class cStep4 : public cStepComponent {
public:
    // (user pointer, host, value for the step frame, unused)
    cStep4(void* user, KERNEL::cHost* host, void* stepValue, void* unused);

    void BindNode(KERNEL::__cFilterComponent__* node) override;
    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override;

    int32_t blackLevel1 = 0;
    int32_t whiteLevel1 = 0;
    int32_t curveStrength2 = 0;
    int32_t blackLevel2 = 0;
    int32_t whiteLevel2 = 0;
    int32_t gradientLevel3 = 0;
    int32_t curveStrength3 = 0;
    int32_t blackPoint5 = 0;
    int32_t whitePoint5 = 100;
    int32_t toneRed5 = 50;
    int32_t toneBlue5 = 50;
    int32_t toneSelector4 = 0;
    int32_t liftAmount4 = 50;
    int32_t darkenAmount4 = 50;

private:
    void* user;
};
