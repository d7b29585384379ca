// Conversion between modes and sample sizes. One converter per pair of sample sizes (templates), so the
// inner loops carry no size test; RGB and gray families convert arithmetically, any other pair goes
// colour by colour through the host's colour conversion.
#include <algorithm>
#include <cstring>

#include "kernel/Host.h"
#include "kernel/PixelBlock.h"
#include "kernel/PixelBlockDetail.h"

namespace KERNEL {

namespace {

// Significant bits and maximum of each sample size: 8-bit 0..255, 16-bit host range 0..32768 (read
// against 32767), 32-bit working samples nominally 0..65535.
template <class T>
struct Sample;
template <>
struct Sample<uint8_t> {
    static constexpr uint32_t max = 255;
    static constexpr int bits = 8;
};
template <>
struct Sample<uint16_t> {
    static constexpr uint32_t max = 32767;
    static constexpr int bits = 15;
};
template <>
struct Sample<int32_t> {
    static constexpr uint32_t max = 65535;
    static constexpr int bits = 16;
};

// Clamp against the source maximum as unsigned (a negative working sample counts as too large), then
// shift to the destination's range.
template <class S, class D>
inline D direct(S v) {
    const uint32_t u = std::min(uint32_t(v), Sample<S>::max);
    constexpr int shift = Sample<D>::bits - Sample<S>::bits;
    if constexpr (shift >= 0)
        return D(u << shift);
    else
        return D(u >> -shift);
}

struct Grid {
    const uint8_t* src;
    uint8_t* dst;
    size_t srcPixel, dstPixel, srcRow, dstRow;
    int32_t rows, columns;
};

template <class T>
inline const T* at(const uint8_t* p) {
    return reinterpret_cast<const T*>(p);
}
template <class T>
inline T* at(uint8_t* p) {
    return reinterpret_cast<T*>(p);
}

template <class S, class D>
void rgbToRgb(const Grid& g) {
    // Tightly packed rows are one flat run of samples: the loop the compiler vectorises.
    const bool packed = g.srcPixel == 3 * sizeof(S) && g.dstPixel == 3 * sizeof(D);
    const uint8_t* srow = g.src;
    uint8_t* drow = g.dst;
    for (int32_t r = 0; r < g.rows; ++r, srow += g.srcRow, drow += g.dstRow) {
        if (packed) {
            const S* __restrict s = at<S>(srow);
            D* __restrict d = at<D>(drow);
            const int32_t n = 3 * g.columns;
            for (int32_t i = 0; i < n; ++i) d[i] = direct<S, D>(s[i]);
            continue;
        }
        const uint8_t* sp = srow;
        uint8_t* dp = drow;
        for (int32_t c = 0; c < g.columns; ++c, sp += g.srcPixel, dp += g.dstPixel) {
            const S* s = at<S>(sp);
            D* d = at<D>(dp);
            d[0] = direct<S, D>(s[0]);
            d[1] = direct<S, D>(s[1]);
            d[2] = direct<S, D>(s[2]);
        }
    }
}

template <class S, class D>
void rgbToGray(const Grid& g) {
    const uint8_t* srow = g.src;
    uint8_t* drow = g.dst;
    for (int32_t r = 0; r < g.rows; ++r, srow += g.srcRow, drow += g.dstRow) {
        const uint8_t* sp = srow;
        uint8_t* dp = drow;
        for (int32_t c = 0; c < g.columns; ++c, sp += g.srcPixel, dp += g.dstPixel)
            *at<D>(dp) = direct<S, D>(*at<S>(sp));
    }
}

template <class S, class D>
void grayToRgb(const Grid& g) {
    const uint8_t* srow = g.src;
    uint8_t* drow = g.dst;
    for (int32_t r = 0; r < g.rows; ++r, srow += g.srcRow, drow += g.dstRow) {
        const uint8_t* sp = srow;
        uint8_t* dp = drow;
        for (int32_t c = 0; c < g.columns; ++c, sp += g.srcPixel, dp += g.dstPixel) {
            const D v = direct<S, D>(*at<S>(sp));
            D* d = at<D>(dp);
            d[0] = v;
            d[1] = v;
            d[2] = v;
        }
    }
}

// The host converts 8-bit components; wider samples are clamped to their maximum before the shift so
// that a 16-bit 32768 arrives as 255, not as an out-of-range 256.
template <class S, class D>
void viaHost(const Grid& g, cColorConversion& conversion, int sourceSamples, int destinationSamples) {
    int16_t* components = conversion.GetComponents();
    if (components == nullptr) return;
    constexpr int toEight = Sample<S>::bits - 8;
    constexpr int fromEight = Sample<D>::bits - 8;
    const uint8_t* srow = g.src;
    uint8_t* drow = g.dst;
    for (int32_t r = 0; r < g.rows; ++r, srow += g.srcRow, drow += g.dstRow) {
        const uint8_t* sp = srow;
        uint8_t* dp = drow;
        for (int32_t c = 0; c < g.columns; ++c, sp += g.srcPixel, dp += g.dstPixel) {
            const S* s = at<S>(sp);
            // Unused components are cleared so a colour table never keys on a previous colour's leftovers.
            components[0] = components[1] = components[2] = components[3] = 0;
            for (int k = 0; k < sourceSamples; ++k)
                components[k] = int16_t(std::min(uint32_t(s[k]), Sample<S>::max) >> toEight);
            conversion.Convert();
            D* d = at<D>(dp);
            for (int k = 0; k < destinationSamples; ++k)
                d[k] = D(uint32_t(uint8_t(components[k])) << fromEight);
        }
    }
}

// Samples per pixel the host path reads or writes: the mode's own count, bounded by the four components
// and by what the block's pixel actually holds.
int hostSamples(const cPixelBlock& b) {
    const int32_t perMode = detail::tableBytesPerPixel(b.mode) / detail::tableBytesPerSample(b.mode);
    return std::min({perMode, 4, int32_t(b.bytesPerPixel / b.bytesPerSample)});
}

template <class S, class D>
void convertGrid(const cPixelBlock& source, cPixelBlock& destination, const Grid& g) {
    const bool rgbIn = isRGBFamily(source.mode), rgbOut = isRGBFamily(destination.mode);
    const bool grayIn = isGrayFamily(source.mode), grayOut = isGrayFamily(destination.mode);
    const auto holds = [](const cPixelBlock& b, uint32_t channels) {
        return b.bytesPerPixel >= channels * b.bytesPerSample;
    };
    if (rgbIn && (rgbOut || grayOut)) {
        if (!holds(source, 3) || !holds(destination, rgbOut ? 3 : 1)) return;
        if (rgbOut)
            rgbToRgb<S, D>(g);
        else
            rgbToGray<S, D>(g);
        return;
    }
    if (grayIn && rgbOut) {
        if (!holds(source, 1) || !holds(destination, 3)) return;
        grayToRgb<S, D>(g);
        return;
    }
    cHost* host = conversionHost();
    if (host == nullptr) return;
    const int sourceSamples = hostSamples(source), destinationSamples = hostSamples(destination);
    if (sourceSamples <= 0 || destinationSamples <= 0) return;
    cColorConversion* conversion = host->GetColorConversion(source.mode, destination.mode);
    if (conversion == nullptr) return;
    viaHost<S, D>(g, *conversion, sourceSamples, destinationSamples);
}

template <class S>
void convertFrom(const cPixelBlock& source, cPixelBlock& destination, const Grid& g) {
    switch (destination.bytesPerSample) {
        case 1: convertGrid<S, uint8_t>(source, destination, g); break;
        case 2: convertGrid<S, uint16_t>(source, destination, g); break;
        case 4: convertGrid<S, int32_t>(source, destination, g); break;
        default: break;
    }
}

}  // namespace

void cPixelBlock::convertTo(cPixelBlock* destination) {
    if (destination == nullptr || !detail::canConvert(*this, *destination)) return;
    if (data == nullptr || destination->data == nullptr) return;
    // Walks the source grid; a smaller destination bounds the walk instead of being overrun.
    const int32_t rows = std::min(storedRows(), destination->storedRows());
    const int32_t columns = std::min(storedColumns(), destination->storedColumns());
    if (rows <= 0 || columns <= 0) return;
    const Grid g{data, destination->data, bytesPerPixel, destination->bytesPerPixel, rowBytes,
                 destination->rowBytes, rows, columns};
    switch (bytesPerSample) {
        case 1: convertFrom<uint8_t>(*this, *destination, g); break;
        case 2: convertFrom<uint16_t>(*this, *destination, g); break;
        case 4: convertFrom<int32_t>(*this, *destination, g); break;
        default: break;
    }
}

}  // namespace KERNEL
