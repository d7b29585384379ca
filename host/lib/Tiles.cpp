#include "Tiles.h"

#include <algorithm>
#include <cstring>

namespace noctiva::host {

Area Area::intersect(const Area& o) const {
    return {std::max(top, o.top), std::max(left, o.left), std::min(bottom, o.bottom), std::min(right, o.right)};
}

std::int32_t paddedRowBytes(int width, int pixelBytes) {
    const std::int64_t tight = std::int64_t(width) * pixelBytes;
    return std::int32_t((tight + 15) / 16 * 16 + 16);
}

std::uint16_t paddingValue(int padding, int depth) {
    const auto v = std::uint32_t(std::clamp(padding, 0, 255));
    return depth == 16 ? std::uint16_t((v * 32768u + 127u) / 255u) : std::uint16_t(v);
}

namespace {

template <typename Sample>
void fillRows(const Raster& image, const Area& area, int lo, int hi, int padding, std::uint8_t* base,
              std::int32_t rowBytes) {
    const int planes = hi - lo + 1;
    const Sample constant = Sample(paddingValue(padding, image.depth()));
    const std::size_t tight = std::size_t(area.width()) * std::size_t(planes) * sizeof(Sample);
    const int inLeft = std::clamp(area.left, 0, image.width), inRight = std::clamp(area.right, 0, image.width);
    for (int y = area.top; y < area.bottom; ++y) {
        auto* row = reinterpret_cast<Sample*>(base + std::size_t(y - area.top) * std::size_t(rowBytes));
        std::memset(reinterpret_cast<std::uint8_t*>(row) + tight, kRowPaddingFill, std::size_t(rowBytes) - tight);
        const bool rowInside = y >= 0 && y < image.height;
        const int sy = std::clamp(y, 0, image.height - 1);
        auto source = [&](int x) { return reinterpret_cast<const Sample*>(image.at(x, sy)) + lo; };
        // The part of the row inside the image is one flat run when every plane is served.
        const bool flat = rowInside && planes == image.channels && inLeft < inRight;
        if (flat)
            std::memcpy(row + std::size_t(inLeft - area.left) * std::size_t(planes), source(inLeft),
                        std::size_t(inRight - inLeft) * std::size_t(planes) * sizeof(Sample));
        for (int x = area.left; x < area.right; ++x) {
            if (flat && x == inLeft) {
                x = inRight - 1;
                continue;
            }
            Sample* px = row + std::size_t(x - area.left) * std::size_t(planes);
            const bool inside = rowInside && x >= 0 && x < image.width;
            if (inside || padding == kPadReplicate) {
                const Sample* src = source(std::clamp(x, 0, image.width - 1));
                for (int p = 0; p < planes; ++p) px[p] = src[p];
            } else {
                const Sample v = padding == kPadNone ? Sample(0) : constant;
                for (int p = 0; p < planes; ++p) px[p] = v;
            }
        }
    }
}

template <typename Sample>
void storeRows(const Raster& image, const Area& area, const Area& clip, int lo, int hi, const std::uint8_t* base,
               std::int32_t rowBytes) {
    const int planes = hi - lo + 1;
    for (int y = clip.top; y < clip.bottom; ++y) {
        const auto* row = reinterpret_cast<const Sample*>(base + std::size_t(y - area.top) * std::size_t(rowBytes));
        const Sample* src = row + std::size_t(clip.left - area.left) * std::size_t(planes);
        auto* dst = reinterpret_cast<Sample*>(image.at(clip.left, y)) + lo;
        if (planes == image.channels) {
            std::memcpy(dst, src, std::size_t(clip.right - clip.left) * std::size_t(planes) * sizeof(Sample));
            continue;
        }
        for (int x = clip.left; x < clip.right; ++x, src += planes, dst += image.channels)
            for (int p = 0; p < planes; ++p) dst[p] = src[p];
    }
}

}  // namespace

std::string checkRequest(const Raster& image, const Area& area, int lo, int hi, int padding) {
    if (lo < 0 || hi < lo || hi >= image.channels)
        return "requested planes " + std::to_string(lo) + ".." + std::to_string(hi) + " outside 0.." +
               std::to_string(image.channels - 1);
    if (padding < kPadError || padding > 255) return "invalid padding value " + std::to_string(padding);
    if (padding == kPadError && !area.within(image.bounds()))
        return "requested area [" + std::to_string(area.left) + "," + std::to_string(area.top) + " - " +
               std::to_string(area.right) + "," + std::to_string(area.bottom) +
               ") leaves the image and the module asked for an error on bounds";
    return {};
}

std::string fillArea(const Raster& image, const Area& area, int lo, int hi, int padding,
                     std::vector<std::uint8_t>& buffer, std::int32_t& rowBytes) {
    if (std::string error = checkRequest(image, area, lo, hi, padding); !error.empty()) return error;
    rowBytes = paddedRowBytes(area.width(), (hi - lo + 1) * image.bytesPerSample);
    const std::size_t total = std::size_t(rowBytes) * std::size_t(area.height());
    if (total > kMaxAreaBytes) return "requested area of " + std::to_string(total) + " bytes is too large";
    // Every sample of the area is written below and each row's padding gets the fill there, so the
    // buffer kept from the last tile is not filled twice.
    buffer.resize(total);
    if (image.bytesPerSample == 2)
        fillRows<std::uint16_t>(image, area, lo, hi, padding, buffer.data(), rowBytes);
    else
        fillRows<std::uint8_t>(image, area, lo, hi, padding, buffer.data(), rowBytes);
    return {};
}

void storeArea(const Raster& image, const Area& area, const Area& clip, int lo, int hi, const std::uint8_t* data,
               std::int32_t rowBytes) {
    const Area c = clip.intersect(area).intersect(image.bounds());
    if (c.empty()) return;
    if (image.bytesPerSample == 2)
        storeRows<std::uint16_t>(image, area, c, lo, hi, data, rowBytes);
    else
        storeRows<std::uint8_t>(image, area, c, lo, hi, data, rowBytes);
}

}  // namespace noctiva::host
