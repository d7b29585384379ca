// The module under test, the settings texts the robustness tests build, and a sample crop.
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "noctiva/host/ImageFile.h"
#include "noctiva/host/Module.h"
#include "steps/ParameterTable.h"

namespace robustness {

inline const noctiva::host::Module& module() {
    static const noctiva::host::Module m(NOCTIVA_MODULE_PATH);
    return m;
}

// Text positions of the step modes.
constexpr int kStep4Mode = 14, kStep3Mode = 33, kStep2Mode = 50, kStep1Mode = 57;

// A full settings text: each parameter's value from `value(number, default)`.
template <class Value>
std::string settingsText(Value value) {
    std::string text = "vek ";
    for (const cParameterInfo& p : shadowParameterTable())
        text += " Parameter" + std::to_string(p.number) + " " + std::to_string(value(p.number, p.defaultValue)) + " ";
    return text;
}

// The defaults with some parameters overridden.
inline std::string settingsWith(const std::map<int, std::int32_t>& overrides) {
    return settingsText([&](int number, std::int32_t fallback) {
        const auto it = overrides.find(number);
        return it == overrides.end() ? fallback : it->second;
    });
}

// The top-left width x height of the noisy sample photograph.
inline noctiva::host::Image sampleCrop(int width, int height) {
    static const noctiva::host::Image whole = noctiva::host::loadImage(NOCTIVA_SAMPLE_IMAGE).image;
    noctiva::host::Image crop(width, height, whole.channels, whole.depth);
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x)
            for (int c = 0; c < whole.channels; ++c) crop.at(x, y, c) = whole.at(x, y, c);
    return crop;
}

}  // namespace robustness
