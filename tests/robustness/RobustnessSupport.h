// The step modes' places in the settings text, and a crop of the sample photograph.
#pragma once

#include "noctiva/host/ImageFile.h"
#include "support/NoctivaModule.h"

namespace robustness {

using testsupport::noctivaModule;
using testsupport::settingsText;
using testsupport::settingsWith;

// Text positions of the step modes.
constexpr int kStep4Mode = 14, kStep3Mode = 33, kStep2Mode = 50, kStep1Mode = 57;

// The top-left width x height of the noisy sample photograph.
inline noctiva::host::Image sampleCrop(int width, int height) {
    static const noctiva::host::Image whole = noctiva::host::loadImage(NOCTIVA_SAMPLE_IMAGE).image;
    noctiva::host::Image crop(width, height, whole.channels, whole.depth);
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x)
            for (int c = 0; c < whole.channels; ++c) crop.set(x, y, c, whole.at(x, y, c));
    return crop;
}

}  // namespace robustness
