// Construction, storage, views and same-mode copies of pixel blocks. Mode conversion lives in
// PixelBlockConvert.cpp, the component-graph side in PixelBlockNode.cpp, numeric operations in ops/.
#include <algorithm>
#include <cstring>
#include <limits>
#include <memory>
#include <utility>

#include "kernel/Memory/MEM.h"
#include "kernel/PixelBlock.h"
#include "kernel/PixelBlockDetail.h"

namespace KERNEL {

namespace {

enum class Kind { Base, Gray, RGB, CMYK, Lab, RGB32 };

Kind kindForMode(uint32_t mode) {
    switch (mode) {
        case kModeGray: return Kind::Gray;
        case kModeRGB: return Kind::RGB;
        case kModeCMYK: return Kind::CMYK;
        case kModeLab: return Kind::Lab;
        case kModeRGB32: return Kind::RGB32;
        default: return Kind::Base;
    }
}

Kind kindOf(const cPixelBlock* b) {
    if (dynamic_cast<const cRGB32PixelBlock*>(b)) return Kind::RGB32;
    if (dynamic_cast<const cRGBPixelBlock*>(b)) return Kind::RGB;
    if (dynamic_cast<const cGRAYSCALEPixelBlock*>(b)) return Kind::Gray;
    if (dynamic_cast<const cCMYKPixelBlock*>(b)) return Kind::CMYK;
    if (dynamic_cast<const cLABPixelBlock*>(b)) return Kind::Lab;
    return Kind::Base;
}

// The mode classes fix mode and sample size whatever they are handed.
void fixModeAndSampleSize(Kind k, uint16_t& mode, uint32_t& bytesPerSample) {
    switch (k) {
        case Kind::Gray: mode = kModeGray; bytesPerSample = 1; break;
        case Kind::RGB: mode = kModeRGB; bytesPerSample = 1; break;
        case Kind::CMYK: mode = kModeCMYK; bytesPerSample = 1; break;
        case Kind::Lab: mode = kModeLab; bytesPerSample = 1; break;
        case Kind::RGB32: mode = kModeRGB32; bytesPerSample = 4; break;
        case Kind::Base: break;
    }
}

template <class... A>
std::unique_ptr<cPixelBlock> make(Kind k, A&&... args) {
    switch (k) {
        case Kind::Gray: return std::make_unique<cGRAYSCALEPixelBlock>(std::forward<A>(args)...);
        case Kind::RGB: return std::make_unique<cRGBPixelBlock>(std::forward<A>(args)...);
        case Kind::CMYK: return std::make_unique<cCMYKPixelBlock>(std::forward<A>(args)...);
        case Kind::Lab: return std::make_unique<cLABPixelBlock>(std::forward<A>(args)...);
        case Kind::RGB32: return std::make_unique<cRGB32PixelBlock>(std::forward<A>(args)...);
        case Kind::Base: break;
    }
    return std::make_unique<cPixelBlock>(std::forward<A>(args)...);
}

// Clips [pos, pos + length) against [0, extent) for subBlock: returns the offset into the block and
// shrinks `length` (never below 0).
int32_t clipSpan(int32_t pos, int32_t origin, int32_t extent, int32_t& length) {
    int32_t offset;
    if (pos < origin) {
        length -= origin - pos;
        offset = 0;
    } else {
        offset = pos - origin;
    }
    length = std::min(length, extent - offset);
    if (length <= 0) {
        length = 0;
        offset = std::clamp(offset, 0, std::max(extent, 0));
    }
    return offset;
}

}  // namespace

// ---------------------------------------------------------------------------------------------------
// Constructors and destructor

cPixelBlock::cPixelBlock(uint16_t targetMode, cPixelBlock* source) { initStorage(targetMode, source, true); }

cPixelBlock::cPixelBlock(uint8_t* d, int32_t width, int32_t height, uint32_t bps, uint32_t bpp, int32_t border,
                         int32_t s, uint16_t m, uint32_t rb, int32_t x, int32_t y)
    : outerRect{int16_t(x), int16_t(x + width), int16_t(y), int16_t(y + height)},
      innerRect{int16_t(x + border), int16_t(x + width - border), int16_t(y + border), int16_t(y + height - border)},
      sampling(s),
      mode(m),
      data(d),
      bytesPerSample(bps),
      bytesPerPixel(bpp),
      rowBytes(rb) {}

cPixelBlock::cPixelBlock(uint8_t* d, const cRect& outer, const cRect& inner, uint32_t bps, uint32_t bpp, int32_t s,
                         uint16_t m, uint32_t rb)
    : outerRect(outer), innerRect(inner), sampling(s), mode(m), data(d), bytesPerSample(bps), bytesPerPixel(bpp),
      rowBytes(rb) {}

cPixelBlock::cPixelBlock(cPixelBlock* source) {
    if (source != nullptr) initStorage(source->mode, source, true);
}

cPixelBlock::cPixelBlock() = default;

cPixelBlock::~cPixelBlock() {
    if (memory != nullptr) {
        data = nullptr;
        if (memory->IsLocked()) memory->Unlock();
        delete memory;
        memory = nullptr;
    }
}

// ---------------------------------------------------------------------------------------------------
// Storage

void cPixelBlock::initStorage(uint16_t targetMode, cPixelBlock* source, bool copy) {
    if (source == nullptr) return;
    if (memory != nullptr) {  // never expected, but never leak
        data = nullptr;
        delete memory;
        memory = nullptr;
    }
    outerRect = source->outerRect;
    innerRect = source->innerRect;
    sampling = source->sampling;
    mode = targetMode;
    const int32_t columns = detail::storedExtent(outerRect.width(), sampling);
    const int32_t rows = detail::storedExtent(outerRect.height(), sampling);
    if (targetMode == source->mode) {
        bytesPerSample = source->bytesPerSample;
        bytesPerPixel = source->bytesPerPixel;
        rowBytes = source->rowBytes;
    } else {
        bytesPerSample = uint32_t(detail::tableBytesPerSample(targetMode));
        bytesPerPixel = uint32_t(detail::tableBytesPerPixel(targetMode));
        rowBytes = 0;
    }
    if (rowBytes == 0) rowBytes = uint32_t(columns) * bytesPerPixel;

    // 64-bit so that a huge block is refused rather than allocated short.
    const uint64_t total = uint64_t(uint32_t(rows)) * rowBytes;
    const uint64_t size = total + total % 4;
    data = nullptr;
    if (size > std::numeric_limits<uint32_t>::max())
        throw cMEMException("could not allocate mem handle", 18, "kernel/Memory");

    // The handle stays local until the block is complete: an exception on the way frees it.
    auto storage = std::make_unique<cMEM>(uint32_t(size));
    struct ClearData {
        uint8_t*& d;
        ~ClearData() { d = nullptr; }
    } clearData{data};
    data = static_cast<uint8_t*>(storage->Lock());
    if (copy && data != nullptr) {
        if (targetMode == source->mode) {
            source->copyTo(this);
        } else if (detail::canConvert(*source, *this)) {
            source->convertTo(this);
        } else {
            // A conversion the kernel does not do yields a blank block, not stale host memory.
            std::memset(data, 0, size_t(size));
        }
    }
    data = nullptr;
    storage->Unlock();
    memory = storage.release();
}

void cPixelBlock::lock() {
    if (memory != nullptr && !memory->IsLocked()) data = static_cast<uint8_t*>(memory->Lock());
}

void cPixelBlock::detach() {
    outerRect = {};
    innerRect = {};
    sampling = 0;
    mode = 0;
    data = nullptr;
    bytesPerSample = 0;
    bytesPerPixel = 0;
    rowBytes = 0;
    memory = nullptr;
}

// ---------------------------------------------------------------------------------------------------
// Factories

cPixelBlock* cPixelBlock::create(uint8_t* d, int32_t width, int32_t height, uint32_t bps, uint32_t bpp,
                                 int32_t border, int32_t s, uint16_t m, uint32_t rb, int32_t x, int32_t y) {
    const Kind k = kindForMode(m);
    fixModeAndSampleSize(k, m, bps);
    return make(k, d, width, height, bps, bpp, border, s, m, rb, x, y).release();
}

cPixelBlock* cPixelBlock::createForMode(uint16_t m) { return make(kindForMode(m)).release(); }

cPixelBlock* cPixelBlock::createView() const {
    const Kind k = kindForMode(mode);
    uint16_t m = mode;
    uint32_t bps = bytesPerSample;
    fixModeAndSampleSize(k, m, bps);
    return make(k, data, outerRect, innerRect, bps, bytesPerPixel, sampling, m, rowBytes).release();
}

cPixelBlock* cPixelBlock::convertedTo(uint16_t targetMode) {
    std::unique_ptr<cPixelBlock> block(createForMode(targetMode));
    block->initStorage(targetMode, this, true);
    return block.release();
}

cPixelBlock* cPixelBlock::createEmpty(uint16_t targetMode) {
    std::unique_ptr<cPixelBlock> block(createForMode(targetMode));
    block->initStorage(targetMode, this, false);
    return block.release();
}

cPixelBlock* cPixelBlock::clone() {
    auto block = std::make_unique<cPixelBlock>();
    block->initStorage(mode, this, true);
    return block.release();
}

cPixelBlock* cGRAYSCALEPixelBlock::clone() {
    auto block = std::make_unique<cGRAYSCALEPixelBlock>();
    block->initStorage(mode, this, true);
    return block.release();
}

cPixelBlock* cRGBPixelBlock::clone() {
    auto block = std::make_unique<cRGBPixelBlock>();
    block->initStorage(mode, this, true);
    return block.release();
}

cPixelBlock* cCMYKPixelBlock::clone() {
    auto block = std::make_unique<cCMYKPixelBlock>();
    block->initStorage(mode, this, true);
    return block.release();
}

cPixelBlock* cLABPixelBlock::clone() {
    auto block = std::make_unique<cLABPixelBlock>();
    block->initStorage(mode, this, true);
    return block.release();
}

cPixelBlock* cRGB32PixelBlock::clone() {
    auto block = std::make_unique<cRGB32PixelBlock>();
    block->initStorage(mode, this, true);
    return block.release();
}

cPixelBlock* cPixelBlock::subBlock(int32_t x, int32_t y, int32_t width, int32_t height) {
    const int32_t xOffset = clipSpan(x, outerRect.x0, outerRect.width(), width);
    const int32_t yOffset = clipSpan(y, outerRect.y0, outerRect.height(), height);
    uint8_t* d = data;
    if (d != nullptr && sampling > 0)
        d += size_t(xOffset / sampling) * bytesPerPixel + size_t(yOffset / sampling) * rowBytes;
    const Kind k = kindOf(this);
    uint16_t m = mode;
    uint32_t bps = bytesPerSample;
    fixModeAndSampleSize(k, m, bps);
    return make(k, d, width, height, bps, bytesPerPixel, 0, sampling, m, rowBytes, 0, 0).release();
}

// ---------------------------------------------------------------------------------------------------
// Copies

void cPixelBlock::copyTo(cPixelBlock* destination) {
    if (destination == nullptr) return;
    const int32_t rows = storedRows(), columns = storedColumns();
    const bool sameSize = rows == destination->storedRows() && columns == destination->storedColumns();
    if (!sameSize || rows <= 0 || columns <= 0) return;
    if (mode != destination->mode) {
        convertTo(destination);
        return;
    }
    if (data == nullptr || destination->data == nullptr) return;

    const uint8_t* s = data;
    uint8_t* d = destination->data;
    if (bytesPerPixel == destination->bytesPerPixel) {
        const size_t rowLength = size_t(columns) * bytesPerPixel;
        for (int32_t r = 0; r < rows; ++r, s += rowBytes, d += destination->rowBytes) std::memmove(d, s, rowLength);
        return;
    }
    const uint32_t pixelLength = std::min(bytesPerPixel, destination->bytesPerPixel);
    for (int32_t r = 0; r < rows; ++r, s += rowBytes, d += destination->rowBytes) {
        const uint8_t* sp = s;
        uint8_t* dp = d;
        for (int32_t c = 0; c < columns; ++c, sp += bytesPerPixel, dp += destination->bytesPerPixel)
            std::memcpy(dp, sp, pixelLength);
    }
}

void cPixelBlock::copyRegion(cPixelBlock* source, cPixelBlock* destination, int32_t dx, int32_t dy, int32_t sx,
                             int32_t sy, const cRect& size) {
    if (source == nullptr || destination == nullptr) return;
    const int32_t width = size.width(), height = size.height();
    std::unique_ptr<cPixelBlock> from(source->subBlock(sx, sy, width, height));
    std::unique_ptr<cPixelBlock> to(destination->subBlock(dx, dy, width, height));
    if (from->mode == to->mode)
        from->copyTo(to.get());
    else
        from->convertTo(to.get());
}

void cPixelBlock::copyInnerFrom(cInput* object) {
    if (object == nullptr) return;
    cPixelBlock* block = object->GetBlock();
    if (block == nullptr) return;
    const cRect& inner = block->innerRect;
    copyRegion(block, this, inner.x0, inner.y0, inner.x0, inner.y0, inner);
}

}  // namespace KERNEL
