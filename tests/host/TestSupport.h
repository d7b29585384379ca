// Helpers shared by the host tests: scripted in-process entry points and image makers.
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <random>
#include <string>

#include "hostapi/HostInterface.h"
#include "noctiva/host/Image.h"

namespace hosttest {

// An entry point whose behaviour the test supplies.
using Script = std::function<void(pi::int16 selector, pi::FilterRecord* r, intptr_t* data, pi::int16* result)>;
inline Script& script() {
    static Script s;
    return s;
}
extern "C" inline void scriptedEntry(pi::int16 selector, pi::FilterRecord* r, intptr_t* data, pi::int16* result) {
    script()(selector, r, data, result);
}

// A deterministic image whose every sample differs from its neighbours.
inline noctiva::host::Image patternImage(int w, int h, int channels, int depth, unsigned seed = 1) {
    noctiva::host::Image image(w, h, channels, depth);
    std::mt19937 random(seed);
    const unsigned range = depth == 16 ? 32769u : 256u;
    for (std::size_t i = 0; i < image.sampleCount(); ++i) image.setSample(i, std::uint16_t(random() % range));
    return image;
}

// A fresh, empty folder for one test.
inline std::filesystem::path scratchFolder(const std::string& name) {
    const auto* info = ::testing::UnitTest::GetInstance()->current_test_info();
    auto folder = std::filesystem::temp_directory_path() / "noctiva-host-tests" /
                  (std::string(info->test_suite_name()) + "." + info->name() + "." + name);
    std::filesystem::remove_all(folder);
    std::filesystem::create_directories(folder);
    return folder;
}

inline int filesIn(const std::filesystem::path& folder) {
    int n = 0;
    for ([[maybe_unused]] const auto& e : std::filesystem::directory_iterator(folder)) ++n;
    return n;
}

}  // namespace hosttest
