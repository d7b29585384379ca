#include "ComparePicture.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <stdexcept>
#include <string>

namespace noctiva::cli {

using host::Image;
using host::Selection;

namespace {

constexpr int kGlyphWidth = 5, kGlyphHeight = 7, kPadding = 2;

struct Glyph {
    char letter;
    std::array<std::uint8_t, kGlyphHeight> rows;  // bit 4 is the leftmost column
};

constexpr std::array<Glyph, 8> kFont{{
    {' ', {0, 0, 0, 0, 0, 0, 0}},
    {'a', {0b00000, 0b00000, 0b01110, 0b00001, 0b01111, 0b10001, 0b01111}},
    {'b', {0b10000, 0b10000, 0b11110, 0b10001, 0b10001, 0b10001, 0b11110}},
    {'e', {0b00000, 0b00000, 0b01110, 0b10001, 0b11111, 0b10000, 0b01110}},
    {'f', {0b00110, 0b01001, 0b01000, 0b11100, 0b01000, 0b01000, 0b01000}},
    {'o', {0b00000, 0b00000, 0b01110, 0b10001, 0b10001, 0b10001, 0b01110}},
    {'r', {0b00000, 0b00000, 0b10110, 0b11001, 0b10000, 0b10000, 0b10000}},
    {'t', {0b01000, 0b01000, 0b11100, 0b01000, 0b01000, 0b01001, 0b00110}},
}};

const Glyph& glyphFor(char c) {
    for (const Glyph& g : kFont)
        if (g.letter == c) return g;
    throw std::invalid_argument(std::string("the label font has no glyph for '") + c + "'");
}

std::uint8_t to8(std::uint16_t sample, int depth) {
    if (depth != 16) return std::uint8_t(std::min<std::uint16_t>(sample, 255));
    const std::uint32_t h = std::min<std::uint32_t>(sample, host::kHost16Max);
    return std::uint8_t((h * 255u + host::kHost16Max / 2) / host::kHost16Max);
}

void fillBox(Image& picture, int x0, int y0, int w, int h, std::uint16_t value) {
    for (int y = std::max(0, y0); y < std::min(picture.height, y0 + h); ++y)
        for (int x = std::max(0, x0); x < std::min(picture.width, x0 + w); ++x)
            for (int c = 0; c < 3; ++c) picture.set(x, y, c, value);
}

// Copies `region` of `source` into `picture` at (dx, dy), columns [fromColumn, toColumn) only.
void blit(Image& picture, const Image& source, const Selection& region, int dx, int dy, int fromColumn,
          int toColumn) {
    for (int y = 0; y < region.height; ++y)
        for (int x = fromColumn; x < toColumn; ++x)
            for (int c = 0; c < 3; ++c)
                picture.set(dx + x, dy + y, c, to8(source.at(region.x + x, region.y + y, c), source.depth));
}

}  // namespace

int labelWidth(std::string_view text, int scale) {
    return (int(text.size()) * (kGlyphWidth + 1) - 1 + 2 * kPadding) * scale;
}
int labelHeight(int scale) { return (kGlyphHeight + 2 * kPadding) * scale; }

void drawLabel(Image& picture, int x, int y, std::string_view text, int scale) {
    for (char c : text) glyphFor(c);  // refuse before drawing anything
    fillBox(picture, x, y, labelWidth(text, scale), labelHeight(scale), 0);
    const int top = y + kPadding * scale;
    int left = x + kPadding * scale;
    for (char c : text) {
        const Glyph& g = glyphFor(c);
        for (int row = 0; row < kGlyphHeight; ++row)
            for (int col = 0; col < kGlyphWidth; ++col)
                if (g.rows[std::size_t(row)] & (1u << (kGlyphWidth - 1 - col)))
                    fillBox(picture, left + col * scale, top + row * scale, scale, scale, 255);
        left += (kGlyphWidth + 1) * scale;
    }
}

Image comparePicture(const Image& before, const Image& after, const std::optional<Selection>& crop,
                     CompareLayout layout) {
    if (before.width != after.width || before.height != after.height)
        throw std::invalid_argument("before and after differ in size");
    const Selection region = crop.value_or(Selection{0, 0, before.width, before.height});
    if (region.x < 0 || region.y < 0 || region.width <= 0 || region.height <= 0 ||
        long(region.x) + region.width > before.width || long(region.y) + region.height > before.height)
        throw std::invalid_argument("crop " + std::to_string(region.x) + "," + std::to_string(region.y) + "," +
                                    std::to_string(region.width) + "," + std::to_string(region.height) +
                                    " lies outside the " + std::to_string(before.width) + " x " +
                                    std::to_string(before.height) + " image");
    // Labels grow with the picture so they stay readable on large images.
    const int scale = std::max(1, std::min(region.width, region.height) / 160);
    const int margin = 3 * scale;

    if (layout == CompareLayout::SideBySide) {
        const int gap = std::max(2, region.width / 100);
        Image picture(2 * region.width + gap, region.height, 3, 8);
        fillBox(picture, region.width, 0, gap, region.height, 255);
        blit(picture, before, region, 0, 0, 0, region.width);
        blit(picture, after, region, region.width + gap, 0, 0, region.width);
        drawLabel(picture, margin, margin, "before", scale);
        drawLabel(picture, region.width + gap + margin, margin, "after", scale);
        return picture;
    }
    Image picture(region.width, region.height, 3, 8);
    const int middle = region.width / 2;
    blit(picture, before, region, 0, 0, 0, middle);
    blit(picture, after, region, 0, 0, middle, region.width);
    fillBox(picture, middle, 0, 1, region.height, 255);
    drawLabel(picture, margin, margin, "before", scale);
    drawLabel(picture, region.width - margin - labelWidth("after", scale), margin, "after", scale);
    return picture;
}

}  // namespace noctiva::cli
