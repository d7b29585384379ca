#include "Pixels.h"

#include <stdexcept>


namespace noctiva::gimp {

using noctiva::host::Image;
using noctiva::host::Selection;

namespace {

void checkShape(std::size_t count, int width, int height, int channels) {
    if (width <= 0 || height <= 0 || (channels != 3 && channels != 4) ||
        count != std::size_t(width) * std::size_t(height) * std::size_t(channels))
        throw std::invalid_argument("pixel data does not match the drawable's size");
}

void checkArea(const Image& image, const Selection& a) {
    if (a.x < 0 || a.y < 0 || a.width <= 0 || a.height <= 0 || a.x + a.width > image.width ||
        a.y + a.height > image.height)
        throw std::invalid_argument("area lies outside the image");
}

}  // namespace

Image hostImageFrom8(std::span<const std::uint8_t> samples, int width, int height, int channels) {
    checkShape(samples.size(), width, height, channels);
    Image image(width, height, channels, 8);
    image.samples8.assign(samples.begin(), samples.end());
    return image;
}

Image hostImageFrom16(std::span<const std::uint16_t> samples, int width, int height, int channels) {
    checkShape(samples.size(), width, height, channels);
    Image image(width, height, channels, 16);
    for (std::size_t i = 0; i < samples.size(); ++i) image.samples16[i] = noctiva::host::hostFromFile16(samples[i]);
    return image;
}

std::vector<std::uint8_t> areaSamples8(const Image& filtered, const Selection& area) {
    checkArea(filtered, area);
    std::vector<std::uint8_t> out;
    out.reserve(std::size_t(area.width) * std::size_t(area.height) * std::size_t(filtered.channels));
    for (int y = area.y; y < area.y + area.height; ++y)
        for (int x = area.x; x < area.x + area.width; ++x)
            for (int c = 0; c < filtered.channels; ++c) {
                out.push_back(std::uint8_t(filtered.at(x, y, c)));
            }
    return out;
}

std::vector<std::uint16_t> areaSamples16(const Image& filtered, std::span<const std::uint16_t> original,
                                         const Selection& area) {
    checkArea(filtered, area);
    if (original.size() != filtered.sampleCount())
        throw std::invalid_argument("original samples do not match the image");
    std::vector<std::uint16_t> out;
    out.reserve(std::size_t(area.width) * std::size_t(area.height) * std::size_t(filtered.channels));
    for (int y = area.y; y < area.y + area.height; ++y) {
        const std::size_t first = filtered.index(area.x, y);
        const std::size_t last = first + std::size_t(area.width) * std::size_t(filtered.channels);
        for (std::size_t i = first; i < last; ++i) {
            // The rule of the command's writer (fileSamples16): an untouched sample keeps its value.
            const std::uint16_t h = filtered.sample(i);
            out.push_back(noctiva::host::hostFromFile16(original[i]) == h ? original[i]
                                                                           : noctiva::host::fileFromHost16(h));
        }
    }
    return out;
}

}  // namespace noctiva::gimp
