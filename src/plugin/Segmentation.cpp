#include "plugin/Segmentation.h"

#include "kernel/PixelBlock.h"

// Rectangles are 16-bit; every comparison and sum is done on the values widened to 32 bits.
cSegmentation::cSegmentation(const pi::Rect16& filterRect, int32_t width, int32_t height, int32_t margin)
    : imageRect(toKernelRect(filterRect)), tileWidth(width), tileHeight(height), overlap(margin) {}

void cSegmentation::FirstColumns() {
    paddedRect.x0 = coreRect.x0 = imageRect.x0;
    if (imageRect.width() > tileWidth + overlap) {
        paddedRect.x1 = int16_t(imageRect.x0 + tileWidth + overlap);
        coreRect.x1 = int16_t(imageRect.x0 + tileWidth);
    } else {
        paddedRect.x1 = coreRect.x1 = imageRect.x1;
    }
}

void cSegmentation::Reset() {
    paddedRect.y0 = coreRect.y0 = imageRect.y0;
    if (imageRect.height() > tileHeight + overlap) {
        paddedRect.y1 = int16_t(imageRect.y0 + tileHeight + overlap);
        coreRect.y1 = int16_t(imageRect.y0 + tileHeight);
    } else {
        paddedRect.y1 = coreRect.y1 = imageRect.y1;
    }
    FirstColumns();
}

bool cSegmentation::Next() {
    if (paddedRect.x1 < imageRect.x1) {
        coreRect.x0 = coreRect.x1;
        paddedRect.x0 = int16_t(coreRect.x0 - overlap);
        if (int32_t(paddedRect.x0) + 2 * overlap + tileWidth >= imageRect.x1) {
            paddedRect.x1 = coreRect.x1 = imageRect.x1;
        } else {
            paddedRect.x1 = int16_t(paddedRect.x1 + tileWidth);
            coreRect.x1 = int16_t(coreRect.x1 + tileWidth);
        }
        return true;
    }
    if (paddedRect.y1 >= imageRect.y1) return false;
    FirstColumns();
    coreRect.y0 = coreRect.y1;
    paddedRect.y0 = int16_t(coreRect.y0 - overlap);
    if (int32_t(paddedRect.y0) + 2 * overlap + tileHeight >= imageRect.y1) {
        paddedRect.y1 = coreRect.y1 = imageRect.y1;
    } else {
        paddedRect.y1 = int16_t(paddedRect.y1 + tileHeight);
        coreRect.y1 = int16_t(coreRect.y1 + tileHeight);
    }
    return true;
}

void cSegmentation::CopyToBlock(KERNEL::cPixelBlock& block) const {
    block.outerRect = paddedRect;
    block.innerRect = coreRect;
}
