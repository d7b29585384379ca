// Moving pixels between the host image and the buffers a filter reads and writes.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "hostapi/HostInterface.h"
#include "noctiva/host/Image.h"

namespace noctiva::host {

// A rectangle in image coordinates, right and bottom exclusive, widened to int so the 16-bit
// fields of the record never overflow in arithmetic.
struct Area {
    int top = 0, left = 0, bottom = 0, right = 0;
    static Area of(const pi::Rect16& r) { return {r.top, r.left, r.bottom, r.right}; }
    bool empty() const { return bottom <= top || right <= left; }
    int width() const { return right - left; }
    int height() const { return bottom - top; }
    Area intersect(const Area& o) const;
    bool within(const Area& o) const {
        return top >= o.top && left >= o.left && bottom <= o.bottom && right <= o.right;
    }
};

// The pixels a run works on, as an image editor keeps them: interleaved samples at the image's
// depth (one byte for 8-bit, a uint16 on the host scale for 16-bit), rows `rowBytes` apart. A
// request that covers whole pixels inside the image is served by pointing into it.
struct Raster {
    std::uint8_t* data = nullptr;
    int width = 0, height = 0, channels = 0, bytesPerSample = 1;
    std::size_t rowBytes = 0;

    int depth() const { return bytesPerSample * 8; }
    Area bounds() const { return {0, 0, height, width}; }
    std::uint8_t* at(int x, int y) const {
        return data + std::size_t(y) * rowBytes + std::size_t(x) * std::size_t(channels * bytesPerSample);
    }
};

// Requests beyond this many bytes are refused instead of attempted.
constexpr std::size_t kMaxAreaBytes = std::size_t(1) << 30;

// Rows are padded past the pixels so a module that assumes tight rows reads the wrong pixels.
std::int32_t paddedRowBytes(int width, int pixelBytes);

// Bytes written into the row padding and the unused tail of a buffer.
constexpr std::uint8_t kRowPaddingFill = 0xCD;

// Padding codes of the interface: 0..255 a constant, -1 edge replication, -2 don't care (we fill
// 0), -3 error when the area leaves the image.
enum : int { kPadReplicate = -1, kPadNone = -2, kPadError = -3 };

// Why a request for planes lo..hi of `area` with `padding` cannot be served, or empty.
std::string checkRequest(const Raster& image, const Area& area, int lo, int hi, int padding);

// Whether the request can be served in place: every plane of pixels inside the image.
inline bool servedInPlace(const Raster& image, const Area& area, int lo, int hi) {
    return lo == 0 && hi == image.channels - 1 && area.within(image.bounds());
}

// Fills `buffer` with planes lo..hi of `image` over `area`. Returns an empty string on success,
// or the reason the request cannot be served.
std::string fillArea(const Raster& image, const Area& area, int lo, int hi, int padding,
                     std::vector<std::uint8_t>& buffer, std::int32_t& rowBytes);

// Writes planes lo..hi of `data` (laid out as fillArea lays it out for `area`) back into `image`,
// limited to `clip`.
void storeArea(const Raster& image, const Area& area, const Area& clip, int lo, int hi, const std::uint8_t* data,
               std::int32_t rowBytes);

// A constant padding value on the image's scale: 8-bit as is, 16-bit as (v*32768+127)/255.
std::uint16_t paddingValue(int padding, int depth);

}  // namespace noctiva::host
