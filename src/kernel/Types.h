// Basic kernel types shared by every layer: rectangles, image modes and the per-mode tables.
#pragma once

#include <cstdint>

namespace KERNEL {

// Rectangle in full-resolution image coordinates; x1 and y1 are exclusive. Field order is x0, x1, y0, y1
// (the host's order is top, left, bottom, right).
struct cRect {
    int16_t x0 = 0;
    int16_t x1 = 0;
    int16_t y0 = 0;
    int16_t y1 = 0;

    friend bool operator==(const cRect&, const cRect&) = default;
    int32_t width() const { return int32_t(x1) - x0; }
    int32_t height() const { return int32_t(y1) - y0; }
    // Divides every coordinate, truncating toward zero.
    cRect operator/(int32_t f) const {
        return {int16_t(x0 / f), int16_t(x1 / f), int16_t(y0 / f), int16_t(y1 / f)};
    }
};

// Image mode numbers: the host's (0..16) plus the kernel's 32-bit RGB working mode.
enum : uint16_t {
    kModeBitmap = 0,
    kModeGray = 1,
    kModeRGB = 3,
    kModeCMYK = 4,
    kModeLab = 9,
    kModeGray16 = 10,
    kModeRGB16 = 11,
    kModeLab16 = 12,
    kModeCMYK16 = 13,
    kModeRGB32 = 17,
};
constexpr int kModeCount = 18;

// Per-mode tables, written by initModeTables (idempotent; run at every dispatch).
extern int32_t modeColorSpace[kModeCount];
extern int32_t modeChannels[kModeCount];
extern int32_t modeBytesPerPixel[kModeCount];
extern int32_t modeBytesPerSample[kModeCount];
void initModeTables();

inline bool isRGBFamily(uint32_t mode) { return mode == kModeRGB || mode == kModeRGB16 || mode == kModeRGB32; }
inline bool isGrayFamily(uint32_t mode) { return mode == kModeGray || mode == kModeGray16; }
// Modes whose samples the kernel knows how to read (bytes per sample defined).
inline bool isConvertibleMode(uint32_t mode) { return mode < kModeCount && modeBytesPerSample[mode] != 0; }

}  // namespace KERNEL
