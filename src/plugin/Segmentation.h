// Cuts the filter rectangle into tiles with margins towards their neighbours, one tile at a time.
#pragma once

#include <cstdint>

#include "hostapi/HostInterface.h"
#include "kernel/Types.h"

namespace KERNEL {
class cPixelBlock;
}

inline KERNEL::cRect toKernelRect(const pi::Rect16& r) { return {r.left, r.right, r.top, r.bottom}; }
inline pi::Rect16 toHostRect(const KERNEL::cRect& r) { return {r.y0, r.x0, r.y1, r.x1}; }

class cSegmentation {
public:
    cSegmentation(const pi::Rect16& filterRect, int32_t tileWidth, int32_t tileHeight, int32_t overlap);
    virtual ~cSegmentation() = default;

    void Reset();
    // Makes the next tile current; false (rectangles unchanged) when none is left.
    bool Next();

    const KERNEL::cRect& ImageRect() const { return imageRect; }
    const KERNEL::cRect& PaddedRect() const { return paddedRect; }
    const KERNEL::cRect& CoreRect() const { return coreRect; }
    void CopyPadded(pi::Rect16& hostRect) const { hostRect = toHostRect(paddedRect); }
    // Outer rectangle = the padded tile, inner rectangle = its core.
    void CopyToBlock(KERNEL::cPixelBlock& block) const;

private:
    // Sets the columns of the first tile of a row.
    void FirstColumns();

    KERNEL::cRect imageRect;
    KERNEL::cRect paddedRect;
    KERNEL::cRect coreRect;
    int32_t tileWidth;
    int32_t tileHeight;
    int32_t overlap;
};
