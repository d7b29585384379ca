// Colour conversion on 8-bit components, as the colour-services callback offers it.
#pragma once

#include <cstdint>

#include "hostapi/HostInterface.h"

namespace noctiva::host {

// Converts `components` in place from `sourceSpace` to `resultSpace` (host colour-space codes:
// 0 RGB, 1 HSB, 2 CMYK, 3 Lab, 4 gray, 5 HSL). Returns pi::noErr or pi::paramErr for a space we
// do not offer (XYZ, chosen space, anything unknown).
pi::OSErr convertColor(pi::int16 sourceSpace, pi::int16 resultSpace, pi::int16 components[4]);

}  // namespace noctiva::host
