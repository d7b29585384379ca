// The kernel's unit of image data: a rectangle of interleaved pixels of one image mode, with an outer
// rectangle (what is stored) and an inner rectangle (what operations work on).
#pragma once

#include <cstdint>

#include "kernel/Component.h"
#include "kernel/Pixel.h"
#include "kernel/Types.h"

namespace KERNEL {

class cMEM;

// Widens the inner rectangles of receiver and destination for the duration of one operation.
struct cMargin {
    int32_t dx = 0;
    int32_t dy = 0;
};

class cPixelBlock : public cInput {
public:
    // 1: converting copy; allocates storage for `mode` with the source's geometry and fills it.
    cPixelBlock(uint16_t mode, cPixelBlock* source);
    // 2: over memory it does not own; rectangles (x, x+width, y, y+height) shrunk by border.
    cPixelBlock(uint8_t* data, int32_t width, int32_t height, uint32_t bytesPerSample, uint32_t bytesPerPixel,
                int32_t border, int32_t sampling, uint16_t mode, uint32_t rowBytes, int32_t x, int32_t y);
    // 3: over memory with both rectangles given.
    cPixelBlock(uint8_t* data, const cRect& outer, const cRect& inner, uint32_t bytesPerSample,
                uint32_t bytesPerPixel, int32_t sampling, uint16_t mode, uint32_t rowBytes);
    // 4: copy with the source's own mode.
    explicit cPixelBlock(cPixelBlock* source);
    // 5: empty.
    cPixelBlock();
    ~cPixelBlock() override;

    // Storage and views.
    void lock();
    cPixelBlock* createView() const;
    void detach();
    static cPixelBlock* create(uint8_t* data, int32_t width, int32_t height, uint32_t bytesPerSample,
                               uint32_t bytesPerPixel, int32_t border, int32_t sampling, uint16_t mode,
                               uint32_t rowBytes, int32_t x, int32_t y);
    static cPixelBlock* createForMode(uint16_t mode);
    static void copyRegion(cPixelBlock* source, cPixelBlock* destination, int32_t dx, int32_t dy, int32_t sx,
                           int32_t sy, const cRect& size);
    void copyInnerFrom(cInput* object);

    // Component interface.
    void BindNode(__cFilterComponent__* node) override;
    void GetBorder(int32_t& bx, int32_t& by) override;
    void Reset() override {}
    cPixelBlock* GetBlock() override { return this; }
    __cFilterComponent__* CreateNode() override;

    // Copies and conversions.
    virtual void copyTo(cPixelBlock* destination);
    virtual cPixelBlock* convertedTo(uint16_t mode);
    virtual cPixelBlock* clone();
    virtual cPixelBlock* createEmpty(uint16_t mode);
    cPixelBlock* createEmpty() { return createEmpty(mode); }
    virtual void convertTo(cPixelBlock* destination);
    virtual cPixelBlock* subBlock(int32_t x, int32_t y, int32_t width, int32_t height);

    // The cursor at image position (x, y); clamped to the stored rectangle (see cPixel).
    cPixel& getPixel(cPixel& cursor, int32_t x, int32_t y) const;

    // Numeric operations. The base versions run the 8-bit RGB implementation on a temporary copy.
    virtual void invert(cPixelBlock* destination, cMargin margin = {});
    virtual void desaturate(cPixelBlock* destination, cMargin margin = {});
    virtual void boostChannel(int32_t channel, uint32_t amount, cPixelBlock* destination, cMargin margin = {});
    virtual void addUniformNoise(uint32_t amount, cPixelBlock* destination, cMargin margin = {});
    virtual void addGaussianNoise(uint32_t amount, cPixelBlock* destination, cMargin margin = {});
    virtual void diffuse(uint32_t amount, cPixelBlock* destination, cMargin margin = {});
    virtual void medianFilter(int32_t radius, int32_t threshold, int32_t channel, int32_t bits,
                              cPixelBlock* destination, cMargin margin = {});
    virtual void rankRangeFilter(int32_t radius, int32_t threshold, int32_t rankA, int32_t rankB, int32_t channel,
                                 int32_t bits, cPixelBlock* destination, cMargin margin = {});
    virtual void blurKernel(double sigma, cPixelBlock* destination, cMargin margin = {});
    virtual void blurMultiScale(double sigma, cPixelBlock* destination, cMargin margin = {});
    virtual void blurLarge(float sigma, cPixelBlock* destination, cMargin margin = {});
    virtual void blur(double sigma, cPixelBlock* destination, cMargin margin = {});
    virtual void blurAlternate(double sigma, int32_t strength, cPixelBlock* destination, cMargin margin = {});
    virtual void unsharpMask(int32_t radius, int32_t amount, cPixelBlock* destination, cMargin margin = {});
    virtual void highPass(int32_t radius, cPixelBlock* destination, cMargin margin = {});
    virtual void edgeGradient(cPixelBlock* destination, cMargin margin = {});
    virtual void edgeGradientGray(cPixelBlock* destination, cMargin margin = {});
    virtual void emboss(double angle, float distance, uint32_t amount, cPixelBlock* destination,
                        cMargin margin = {});
    virtual void embossGray(double angle, float distance, uint32_t amount, cPixelBlock* destination,
                            cMargin margin = {});
    virtual void embossColor(double angle, float distance, uint32_t amount, cPixelBlock* destination,
                             cMargin margin = {});
    virtual void passThrough(int32_t argument, cMargin margin = {});
    virtual void fill(uint32_t c0, uint32_t c1, uint32_t c2);

    // Stored grid size.
    int32_t storedColumns() const { return sampling ? outerRect.width() / sampling : 0; }
    int32_t storedRows() const { return sampling ? outerRect.height() / sampling : 0; }

    cRect outerRect;
    cRect innerRect;
    int32_t sampling = 0;
    uint16_t mode = 0;
    uint8_t* data = nullptr;
    uint32_t bytesPerSample = 0;
    uint32_t bytesPerPixel = 0;
    uint32_t rowBytes = 0;
    cMEM* memory = nullptr;

protected:
    // Storage initialisation shared by the allocating constructors and factories.
    void initStorage(uint16_t targetMode, cPixelBlock* source, bool copy);
};

class cGRAYSCALEPixelBlock : public cPixelBlock {
public:
    using cPixelBlock::cPixelBlock;
    cPixelBlock* clone() override;
};

class cCMYKPixelBlock : public cPixelBlock {
public:
    using cPixelBlock::cPixelBlock;
    cPixelBlock* clone() override;
};

class cLABPixelBlock : public cPixelBlock {
public:
    using cPixelBlock::cPixelBlock;
    cPixelBlock* clone() override;
};

// 8-bit RGB: carries the whole 8-bit operation set.
class cRGBPixelBlock : public cPixelBlock {
public:
    using cPixelBlock::cPixelBlock;
    cPixelBlock* clone() override;
    void invert(cPixelBlock* destination, cMargin margin = {}) override;
    void desaturate(cPixelBlock* destination, cMargin margin = {}) override;
    void boostChannel(int32_t channel, uint32_t amount, cPixelBlock* destination, cMargin margin = {}) override;
    void addUniformNoise(uint32_t amount, cPixelBlock* destination, cMargin margin = {}) override;
    void addGaussianNoise(uint32_t amount, cPixelBlock* destination, cMargin margin = {}) override;
    void diffuse(uint32_t amount, cPixelBlock* destination, cMargin margin = {}) override;
    void blurKernel(double sigma, cPixelBlock* destination, cMargin margin = {}) override;
    void blurMultiScale(double sigma, cPixelBlock* destination, cMargin margin = {}) override;
    void blurLarge(float sigma, cPixelBlock* destination, cMargin margin = {}) override;
    void blur(double sigma, cPixelBlock* destination, cMargin margin = {}) override;
    void unsharpMask(int32_t radius, int32_t amount, cPixelBlock* destination, cMargin margin = {}) override;
    void highPass(int32_t radius, cPixelBlock* destination, cMargin margin = {}) override;
    void edgeGradient(cPixelBlock* destination, cMargin margin = {}) override;
    void edgeGradientGray(cPixelBlock* destination, cMargin margin = {}) override;
    void emboss(double angle, float distance, uint32_t amount, cPixelBlock* destination,
                cMargin margin = {}) override;
    void embossGray(double angle, float distance, uint32_t amount, cPixelBlock* destination,
                    cMargin margin = {}) override;
    void embossColor(double angle, float distance, uint32_t amount, cPixelBlock* destination,
                     cMargin margin = {}) override;
    void passThrough(int32_t argument, cMargin margin = {}) override;
    void fill(uint32_t c0, uint32_t c1, uint32_t c2) override;
    // 8-bit median (nothing in this filter calls it).
    virtual void medianFilterWorker(int32_t radius, int32_t threshold, int32_t channel, int32_t bits,
                                    cPixelBlock* destination, cMargin margin = {});
};

// The 32-bit working block: three signed 32-bit samples per pixel, nominal range 0..65535.
class cRGB32PixelBlock : public cPixelBlock {
public:
    using cPixelBlock::cPixelBlock;
    cPixelBlock* clone() override;
    void invert(cPixelBlock* destination, cMargin margin = {}) override;
    void medianFilter(int32_t radius, int32_t threshold, int32_t channel, int32_t bits, cPixelBlock* destination,
                      cMargin margin = {}) override;
    void rankRangeFilter(int32_t radius, int32_t threshold, int32_t rankA, int32_t rankB, int32_t channel,
                         int32_t bits, cPixelBlock* destination, cMargin margin = {}) override;
    void blurKernel(double sigma, cPixelBlock* destination, cMargin margin = {}) override;
    void blurLarge(float sigma, cPixelBlock* destination, cMargin margin = {}) override;
    void blur(double sigma, cPixelBlock* destination, cMargin margin = {}) override;
    void blurAlternate(double sigma, int32_t strength, cPixelBlock* destination, cMargin margin = {}) override;
    void fill(uint32_t c0, uint32_t c1, uint32_t c2) override;
    virtual void medianFilterWorker(int32_t radius, int32_t threshold, int32_t channel, int32_t bits,
                                    cPixelBlock* destination, cMargin margin = {});
    virtual void rankRangeFilterWorker(int32_t radius, int32_t threshold, int32_t high, int32_t low,
                                       int32_t channel, int32_t bits, cPixelBlock* destination,
                                       cMargin margin = {});
    virtual void blurAlternateKernel(double sigma, int32_t strength, cPixelBlock* destination,
                                     cMargin margin = {});
    virtual void blurAlternateLarge(float sigma, int32_t strength, cPixelBlock* destination,
                                    cMargin margin = {});
};

// Inline so that the per-row cursor fetch of hot loops costs no call.
inline cPixel& cPixelBlock::getPixel(cPixel& c, int32_t x, int32_t y) const {
    c = cPixel{};
    const int32_t s = sampling;
    int32_t xs = x, ys = y;
    if (s != 1 && s != 0) {
        xs = (x + x % s) / s;
        ys = (y + y % s) / s;
    }
    if (data == nullptr || s == 0) return c;
    const int32_t rx0 = outerRect.x0 / s, rx1 = outerRect.x1 / s;
    const int32_t ry0 = outerRect.y0 / s, ry1 = outerRect.y1 / s;
    // No stored pixel to clamp to: a zeroed cursor, never a column of -1.
    if (rx1 <= rx0 || ry1 <= ry0) return c;
    if (xs < rx0) {
        c.clampLeft = uint32_t(rx0 - xs);
        xs = rx0;
    } else if (xs >= rx1) {
        c.clampRight = uint32_t(xs - rx1 + 1);
        xs = rx1 - 1;
    }
    if (ys < ry0) {
        c.clampTop = uint32_t(ry0 - ys);
        ys = ry0;
    } else if (ys >= ry1) {
        c.clampBottom = uint32_t(ys - ry1 + 1);
        ys = ry1 - 1;
    }
    c.column = uint32_t(xs - rx0);
    c.columnsLeft = uint32_t(rx1 - xs);
    c.row = uint32_t(ys - ry0);
    c.rowsLeft = uint32_t(ry1 - ys);
    c.pixelStep = bytesPerPixel;
    c.rowStep = rowBytes;
    c.channel[0] = data + size_t(c.row) * rowBytes + size_t(c.column) * bytesPerPixel;
    c.channel[1] = c.channel[0] + bytesPerSample;
    c.channel[2] = c.channel[1] + bytesPerSample;
    return c;
}

}  // namespace KERNEL
