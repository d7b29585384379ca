// Internal helpers shared by the pixel-block sources; not part of the kernel's interface.
#pragma once

#include <cstdint>

#include "kernel/PixelBlock.h"
#include "kernel/Types.h"

namespace KERNEL::detail {

// Stored pixels along one axis; an empty or inverted extent, or a block without sampling, stores none.
inline int32_t storedExtent(int32_t extent, int32_t sampling) {
    return (sampling > 0 && extent > 0) ? extent / sampling : 0;
}

inline int32_t tableBytesPerSample(uint32_t mode) { return mode < uint32_t(kModeCount) ? modeBytesPerSample[mode] : 0; }
inline int32_t tableBytesPerPixel(uint32_t mode) { return mode < uint32_t(kModeCount) ? modeBytesPerPixel[mode] : 0; }

inline bool supportedSampleSize(uint32_t bytes) { return bytes == 1 || bytes == 2 || bytes == 4; }

// The kernel converts only between modes that have a sample size, with samples of 1, 2 or 4 bytes.
// Anything else (modes 2, 5-8, 14-16 and unknown numbers) is refused without touching the destination.
inline bool canConvert(const cPixelBlock& source, const cPixelBlock& destination) {
    return isConvertibleMode(source.mode) && isConvertibleMode(destination.mode) &&
           supportedSampleSize(source.bytesPerSample) && supportedSampleSize(destination.bytesPerSample);
}

}  // namespace KERNEL::detail
