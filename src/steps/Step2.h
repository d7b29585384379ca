// Step 2 of the shadow chain, on Lab: the noise filters (impulse, median, rank, blur, wavelet).
#pragma once

#include <cstdint>

#include "steps/StepComponent.h"

namespace KERNEL {
class cPixelBlock;
}

class cStep2 : public cStepComponent {
public:
    // (user pointer, host, value for the step frame, unused)
    cStep2(void* user, KERNEL::cHost* host, void* stepValue, void* unused);

    void BindNode(KERNEL::__cFilterComponent__* node) override;
    // Its filters reach 20 pixels, the wide variant 30.
    void GetBorder(int32_t& bx, int32_t& by) override;
    void Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) override;

    int32_t impulseLevel = 55;
    int32_t impulseFlatness = 70;
    int32_t lumaMedianRadius = 1;
    int32_t lumaMedianKeep = 8;
    int32_t rankPreset3 = 2;
    int32_t smoothThreshold4 = 5;
    int32_t smoothStrength4 = 50;
    int32_t edgeLimit5 = 15;
    int32_t lumaKeepPercent5 = 70;
    int32_t rankPreset6 = 0;
    int32_t colourTolerance7 = 100;
    int32_t waveletStrength7 = 100;
    int32_t referenceRed7 = 40;
    int32_t referenceGreen7 = 50;
    int32_t referenceBlue7 = 70;
    int32_t preset9 = 0;

private:
    void* user;
};
