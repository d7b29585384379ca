// TIFF through libtiff: contiguous RGB/RGBA, 8 or 16 bits, strips or tiles.
#include <tiffio.h>
#include <unistd.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "ImageFileInternal.h"
#include "noctiva/host/Error.h"

namespace noctiva::host::detail {

namespace {

// libtiff's handlers are process-wide; the message of the current thread's last error is kept here.
thread_local std::string tLastTiffError;

void onTiffError(const char* module, const char* format, va_list args) {
    char text[512];
    std::vsnprintf(text, sizeof text, format, args);
    tLastTiffError = text;
}

void installHandlers() {
    static std::once_flag once;
    std::call_once(once, [] {
        TIFFSetErrorHandler(onTiffError);
        TIFFSetWarningHandler(nullptr);
    });
}

std::string lastError(const std::string& fallback) {
    std::string e = tLastTiffError.empty() ? fallback : tLastTiffError;
    tLastTiffError.clear();
    return e;
}

struct TiffCloser {
    void operator()(TIFF* t) const { TIFFClose(t); }
};
using TiffPtr = std::unique_ptr<TIFF, TiffCloser>;

const char* photometricName(uint16_t p) {
    switch (p) {
        case PHOTOMETRIC_MINISWHITE:
        case PHOTOMETRIC_MINISBLACK: return "gray";
        case PHOTOMETRIC_PALETTE: return "palette";
        case PHOTOMETRIC_SEPARATED: return "CMYK";
        case PHOTOMETRIC_YCBCR: return "YCbCr";
        case PHOTOMETRIC_CIELAB:
        case PHOTOMETRIC_ICCLAB:
        case PHOTOMETRIC_ITULAB: return "Lab";
        case PHOTOMETRIC_MASK: return "mask";
        default: return "unknown";
    }
}

// Copies one decoded row segment (file byte order already native) into the image.
void storeSamples(Image& image, const unsigned char* src, int x0, int y, int count) {
    const std::size_t at = image.index(x0, y), n = std::size_t(count) * std::size_t(image.channels);
    if (image.depth == 16)
        std::memcpy(&image.samples16[at], src, n * 2);
    else
        std::memcpy(&image.samples8[at], src, n);
}

}  // namespace

Image readTiff(const std::string& path) {
    installHandlers();
    tLastTiffError.clear();
    TiffPtr tif(TIFFOpen(path.c_str(), "r"));
    if (!tif) throw HostError(path, "broken TIFF file: " + lastError("cannot open"));

    uint32_t width = 0, height = 0;
    uint16_t bits = 0, spp = 0, photometric = 0, planar = PLANARCONFIG_CONTIG, format = SAMPLEFORMAT_UINT;
    TIFFGetField(tif.get(), TIFFTAG_IMAGEWIDTH, &width);
    TIFFGetField(tif.get(), TIFFTAG_IMAGELENGTH, &height);
    TIFFGetFieldDefaulted(tif.get(), TIFFTAG_BITSPERSAMPLE, &bits);
    TIFFGetFieldDefaulted(tif.get(), TIFFTAG_SAMPLESPERPIXEL, &spp);
    TIFFGetFieldDefaulted(tif.get(), TIFFTAG_PLANARCONFIG, &planar);
    TIFFGetFieldDefaulted(tif.get(), TIFFTAG_SAMPLEFORMAT, &format);
    if (!TIFFGetField(tif.get(), TIFFTAG_PHOTOMETRIC, &photometric))
        throw HostError(path, "broken TIFF file: no photometric interpretation");
    if (photometric != PHOTOMETRIC_RGB)
        throw HostError(path, std::string("unsupported TIFF colour space: ") + photometricName(photometric) +
                                  " (only RGB and RGBA)");
    if (spp != 3 && spp != 4)
        throw HostError(path, "unsupported TIFF with " + std::to_string(spp) + " samples per pixel (only RGB and RGBA)");
    if ((bits != 8 && bits != 16) || format != SAMPLEFORMAT_UINT)
        throw HostError(path, "unsupported TIFF sample format (only unsigned 8 and 16 bits)");
    if (planar != PLANARCONFIG_CONTIG) throw HostError(path, "unsupported TIFF with separate colour planes");
    if (width == 0 || height == 0) throw HostError(path, "image is empty");
    if (width > uint32_t(kMaxImageExtent) || height > uint32_t(kMaxImageExtent))
        throw HostError(path, "image of " + std::to_string(width) + " x " + std::to_string(height) +
                                  " pixels is larger than 32767 in a dimension");

    Image image(int(width), int(height), spp, bits);
    const std::size_t pixelBytes = std::size_t(spp) * (bits / 8);
    if (TIFFIsTiled(tif.get())) {
        uint32_t tw = 0, th = 0;
        TIFFGetField(tif.get(), TIFFTAG_TILEWIDTH, &tw);
        TIFFGetField(tif.get(), TIFFTAG_TILELENGTH, &th);
        const tmsize_t tileSize = TIFFTileSize(tif.get());
        if (tw == 0 || th == 0 || tileSize < tmsize_t(std::size_t(tw) * th * pixelBytes))
            throw HostError(path, "broken TIFF file: bad tile size");
        std::vector<unsigned char> tile(static_cast<std::size_t>(tileSize));
        for (uint32_t ty = 0; ty < height; ty += th)
            for (uint32_t tx = 0; tx < width; tx += tw) {
                if (TIFFReadTile(tif.get(), tile.data(), tx, ty, 0, 0) < 0)
                    throw HostError(path, "broken TIFF file: " + lastError("cannot read tile"));
                const uint32_t rows = std::min(th, height - ty), cols = std::min(tw, width - tx);
                for (uint32_t r = 0; r < rows; ++r)
                    storeSamples(image, tile.data() + std::size_t(r) * tw * pixelBytes, int(tx), int(ty + r), int(cols));
            }
    } else {
        const tmsize_t lineSize = TIFFScanlineSize(tif.get());
        if (lineSize < tmsize_t(width * pixelBytes)) throw HostError(path, "broken TIFF file: bad row size");
        std::vector<unsigned char> line(static_cast<std::size_t>(lineSize));
        for (uint32_t y = 0; y < height; ++y) {
            if (TIFFReadScanline(tif.get(), line.data(), y, 0) < 0)
                throw HostError(path, "broken TIFF file: " + lastError("cannot read row " + std::to_string(y)));
            storeSamples(image, line.data(), 0, int(y), int(width));
        }
    }
    return image;
}

void writeTiff(int fd, const std::string& name, const Image& image) {
    installHandlers();
    tLastTiffError.clear();
    TiffPtr tif(TIFFFdOpen(fd, name.c_str(), "w"));
    if (!tif) {
        ::close(fd);
        throw HostError(name, "cannot write TIFF: " + lastError("cannot open"));
    }
    TIFF* t = tif.get();
    const uint16_t spp = uint16_t(image.channels);
    bool ok = TIFFSetField(t, TIFFTAG_IMAGEWIDTH, uint32_t(image.width)) &&
              TIFFSetField(t, TIFFTAG_IMAGELENGTH, uint32_t(image.height)) &&
              TIFFSetField(t, TIFFTAG_SAMPLESPERPIXEL, spp) &&
              TIFFSetField(t, TIFFTAG_BITSPERSAMPLE, uint16_t(image.depth)) &&
              TIFFSetField(t, TIFFTAG_SAMPLEFORMAT, uint16_t(SAMPLEFORMAT_UINT)) &&
              TIFFSetField(t, TIFFTAG_PHOTOMETRIC, uint16_t(PHOTOMETRIC_RGB)) &&
              TIFFSetField(t, TIFFTAG_PLANARCONFIG, uint16_t(PLANARCONFIG_CONTIG)) &&
              TIFFSetField(t, TIFFTAG_ORIENTATION, uint16_t(ORIENTATION_TOPLEFT)) &&
              TIFFSetField(t, TIFFTAG_XRESOLUTION, 72.0) && TIFFSetField(t, TIFFTAG_YRESOLUTION, 72.0) &&
              TIFFSetField(t, TIFFTAG_RESOLUTIONUNIT, uint16_t(RESUNIT_INCH));
    const uint16_t compression =
        TIFFIsCODECConfigured(COMPRESSION_ADOBE_DEFLATE) ? COMPRESSION_ADOBE_DEFLATE : COMPRESSION_NONE;
    ok = ok && TIFFSetField(t, TIFFTAG_COMPRESSION, compression);
    if (compression != COMPRESSION_NONE) ok = ok && TIFFSetField(t, TIFFTAG_PREDICTOR, uint16_t(PREDICTOR_HORIZONTAL));
    if (spp == 4) {
        const uint16_t extra[] = {EXTRASAMPLE_UNASSALPHA};
        ok = ok && TIFFSetField(t, TIFFTAG_EXTRASAMPLES, uint16_t(1), extra);
    }
    ok = ok && TIFFSetField(t, TIFFTAG_ROWSPERSTRIP, TIFFDefaultStripSize(t, 0));
    if (!ok) throw HostError(name, "cannot write TIFF: " + lastError("cannot set tags"));

    const std::size_t n = std::size_t(image.width) * spp;
    std::vector<unsigned char> line(n * (image.depth / 8));
    for (int y = 0; y < image.height; ++y) {
        const std::size_t at = image.index(0, y);
        if (image.depth == 16)
            std::memcpy(line.data(), &image.samples16[at], n * 2);
        else
            std::memcpy(line.data(), &image.samples8[at], n);
        if (TIFFWriteScanline(t, line.data(), uint32_t(y), 0) < 0)
            throw HostError(name, "cannot write TIFF: " + lastError("write failed"));
    }
    if (!TIFFFlush(t)) throw HostError(name, "cannot write TIFF: " + lastError("flush failed (disk full?)"));
}

}  // namespace noctiva::host::detail
