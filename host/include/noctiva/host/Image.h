// The image the host serves to a filter: RGB or RGBA, interleaved, one uint16 per sample.
// 8-bit images hold 0..255, 16-bit images hold the host scale 0..32768.
#pragma once

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
    std::vector<std::uint16_t> samples;

    Image() = default;
    Image(int w, int h, int c, int d)
        : width(w), height(h), channels(c), depth(d), samples(std::size_t(w) * std::size_t(h) * std::size_t(c)) {}

    bool hasAlpha() const { return channels == 4; }
    std::uint16_t maxValue() const { return depth == 16 ? kHost16Max : 255; }
    std::size_t index(int x, int y, int c = 0) const {
        return (std::size_t(y) * std::size_t(width) + std::size_t(x)) * std::size_t(channels) + std::size_t(c);
    }
    std::uint16_t& at(int x, int y, int c) { return samples[index(x, y, c)]; }
    std::uint16_t at(int x, int y, int c) const { return samples[index(x, y, c)]; }
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
