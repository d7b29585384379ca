// The image the host serves to a filter: RGB or RGBA, interleaved. An 8-bit image keeps one byte
// per sample (0..255), a 16-bit image one uint16 per sample on the host scale 0..32768, so the
// filter's tiles point straight into the image's own storage at its depth.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <vector>

namespace noctiva::host {

constexpr int kMaxImageExtent = 32767;  // the interface's rectangles are 16-bit
constexpr std::uint16_t kHost16Max = 32768;

struct Image {
    int width = 0;
    int height = 0;
    int channels = 3;  // 3 = RGB, 4 = RGBA
    int depth = 8;     // bits per channel in the file and for the filter: 8 or 16
    std::vector<std::uint8_t> samples8;    // depth 8 only
    std::vector<std::uint16_t> samples16;  // depth 16 only

    Image() = default;
    Image(int w, int h, int c, int d) : width(w), height(h), channels(c), depth(d) {
        const std::size_t n = std::size_t(w) * std::size_t(h) * std::size_t(c);
        if (d == 16)
            samples16.resize(n);
        else
            samples8.resize(n);
    }

    bool hasAlpha() const { return channels == 4; }
    std::uint16_t maxValue() const { return depth == 16 ? kHost16Max : 255; }
    std::size_t sampleCount() const { return depth == 16 ? samples16.size() : samples8.size(); }
    // The store of the image's depth holds every sample, the other none.
    bool samplesMatchSize() const {
        const std::size_t n = std::size_t(width) * std::size_t(height) * std::size_t(channels);
        return depth == 16 ? samples16.size() == n && samples8.empty() : samples8.size() == n && samples16.empty();
    }
    std::size_t index(int x, int y, int c = 0) const {
        return (std::size_t(y) * std::size_t(width) + std::size_t(x)) * std::size_t(channels) + std::size_t(c);
    }
    std::uint16_t sample(std::size_t i) const { return depth == 16 ? samples16[i] : samples8[i]; }
    // An 8-bit sample saturates at 255.
    void setSample(std::size_t i, std::uint16_t v) {
        if (depth == 16)
            samples16[i] = v;
        else
            samples8[i] = std::uint8_t(std::min<std::uint16_t>(v, 255));
    }
    std::uint16_t at(int x, int y, int c) const { return sample(index(x, y, c)); }
    void set(int x, int y, int c, std::uint16_t v) { setSample(index(x, y, c), v); }
    // Every sample as uint16, whatever the depth.
    std::vector<std::uint16_t> widened() const {
        return depth == 16 ? samples16 : std::vector<std::uint16_t>(samples8.begin(), samples8.end());
    }
    bool operator==(const Image&) const = default;
};

// 16-bit files use 0..65535, the host 0..32768. Both directions round to nearest with integer
// arithmetic; hostFromFile16(fileFromHost16(h)) == h for every host value, and both are monotone.
constexpr std::uint16_t hostFromFile16(std::uint16_t v) {
    return std::uint16_t((std::uint32_t(v) * 32768u + 32767u) / 65535u);
}
constexpr std::uint16_t fileFromHost16(std::uint16_t h) {
    // Filters may write above the nominal maximum; such values saturate.
    const std::uint32_t clamped = h > kHost16Max ? kHost16Max : h;
    return std::uint16_t((clamped * 65535u + 16384u) / 32768u);
}

}  // namespace noctiva::host
