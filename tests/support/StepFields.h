// The settings fields of each step in the order the settings text carries them, without the step's
// mode (which follows them in the text).
#pragma once

#include <cstdint>
#include <vector>

#include "steps/Step1.h"
#include "steps/Step2.h"
#include "steps/Step3.h"
#include "steps/Step4.h"

namespace testsupport {

inline std::vector<int32_t*> fieldsOf(cStep4& s) {
    return {&s.blackLevel1, &s.whiteLevel1,  &s.curveStrength2, &s.blackLevel2,   &s.whiteLevel2,
            &s.gradientLevel3, &s.curveStrength3, &s.blackPoint5, &s.whitePoint5,  &s.toneRed5,
            &s.toneBlue5,   &s.toneSelector4, &s.liftAmount4,   &s.darkenAmount4};
}
inline std::vector<int32_t*> fieldsOf(cStep3& s) {
    return {&s.gradeMix,     &s.saturationPercent, &s.warmthPercent, &s.shiftStrength3, &s.shiftBase3,
            &s.shiftLevelR3, &s.shiftLevelG3,      &s.shiftLevelB3,  &s.shiftStrength4, &s.shiftBase4,
            &s.shiftLevelR4, &s.shiftLevelG4,      &s.shiftLevelB4,  &s.toneSelector,   &s.toneAmount0,
            &s.toneAmount1,  &s.toneAmount2,       &s.toneAmount3};
}
inline std::vector<int32_t*> fieldsOf(cStep2& s) {
    return {&s.impulseLevel,     &s.impulseFlatness,  &s.lumaMedianRadius, &s.lumaMedianKeep,
            &s.rankPreset3,      &s.smoothThreshold4, &s.smoothStrength4,  &s.edgeLimit5,
            &s.lumaKeepPercent5, &s.rankPreset6,      &s.colourTolerance7, &s.waveletStrength7,
            &s.referenceRed7,    &s.referenceGreen7,  &s.referenceBlue7,   &s.preset9};
}
inline std::vector<int32_t*> fieldsOf(cStep1& s) {
    return {&s.medianRadius1, &s.medianRadius2, &s.chromaLimitPercent, &s.edgeStrength, &s.medianRadius4,
            &s.preset3};
}

}  // namespace testsupport
