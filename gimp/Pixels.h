// The drawable's pixels as GEGL hands them ("R'G'B'(A) u8" or "u16", interleaved) and the host
// image the module works on. 16-bit samples map to the host scale exactly as the command maps file
// samples, and a sample the filter left alone goes back with its original 16-bit value.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "noctiva/host/Image.h"
#include "noctiva/host/Session.h"

namespace noctiva::gimp {

noctiva::host::Image hostImageFrom8(std::span<const std::uint8_t> samples, int width, int height, int channels);
noctiva::host::Image hostImageFrom16(std::span<const std::uint16_t> samples, int width, int height, int channels);

// The samples of `area` of the filtered image, row by row, ready for the shadow buffer.
// `original` holds the 16-bit samples hostImageFrom16 was made from (the whole drawable).
std::vector<std::uint8_t> areaSamples8(const noctiva::host::Image& filtered, const noctiva::host::Selection& area);
std::vector<std::uint16_t> areaSamples16(const noctiva::host::Image& filtered, std::span<const std::uint16_t> original,
                                         const noctiva::host::Selection& area);

}  // namespace noctiva::gimp
