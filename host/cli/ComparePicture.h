// A before/after picture so a person sees the filter's effect at a glance: the two images (or the
// same crop of both) side by side, or one frame split down the middle, each half labelled.
#pragma once

#include <optional>
#include <string_view>

#include "noctiva/host/Image.h"
#include "noctiva/host/Session.h"

namespace noctiva::cli {

enum class CompareLayout { SideBySide, Split };

// An 8-bit RGB picture (alpha is left out, 16-bit samples are rounded to 8 bits). `crop` must lie
// inside both images, which must have the same size.
host::Image comparePicture(const host::Image& before, const host::Image& after,
                           const std::optional<host::Selection>& crop, CompareLayout layout);

// Draws `text` with the built-in 5 x 7 font, each font pixel `scale` x `scale`, white on a black
// box, top-left corner at (x, y); whatever falls outside the image is clipped. The font holds only
// the lower-case letters of the labels ("before", "after") and the blank; anything else throws
// std::invalid_argument.
void drawLabel(host::Image& picture, int x, int y, std::string_view text, int scale);

// Width and height of the box drawLabel fills.
int labelWidth(std::string_view text, int scale);
int labelHeight(int scale);

}  // namespace noctiva::cli
