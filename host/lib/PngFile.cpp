// PNG through libpng's classic interface. libpng reports errors by longjmp, so the functions that
// call setjmp keep only trivially destructible locals; everything else lives in the caller.
#include <png.h>
#include <unistd.h>

#include <csetjmp>
#include <cstdio>
#include <memory>
#include <vector>

#include "ImageFileInternal.h"
#include "noctiva/host/Error.h"

namespace noctiva::host::detail {

namespace {

struct PngErrors {
    std::jmp_buf jump;
    char message[256] = {};
};

[[noreturn]] void onPngError(png_structp png, png_const_charp message) {
    auto* errors = static_cast<PngErrors*>(png_get_error_ptr(png));
    std::snprintf(errors->message, sizeof errors->message, "%s", message ? message : "unknown error");
    std::longjmp(errors->jump, 1);
}
void onPngWarning(png_structp, png_const_charp) {}

const char* colourTypeName(int type) {
    switch (type) {
        case PNG_COLOR_TYPE_GRAY: return "gray";
        case PNG_COLOR_TYPE_GRAY_ALPHA: return "gray with alpha";
        case PNG_COLOR_TYPE_PALETTE: return "palette";
        default: return "unknown";
    }
}

struct PngRead {
    Image image;
    std::vector<png_byte> raw;
    std::vector<png_bytep> rows;
    const char* unsupported = nullptr;  // set when the file is readable but not RGB/RGBA 8/16
    std::string unsupportedDetail;
};

// Returns false with errors.message set when libpng failed.
bool readCore(png_structp png, png_infop info, std::FILE* file, PngErrors& errors, PngRead& out) {
    if (setjmp(errors.jump)) return false;
    png_init_io(png, file);
    png_read_info(png, info);
    png_uint_32 width = 0, height = 0;
    int bitDepth = 0, colourType = 0, interlace = 0;
    png_get_IHDR(png, info, &width, &height, &bitDepth, &colourType, &interlace, nullptr, nullptr);
    if (colourType != PNG_COLOR_TYPE_RGB && colourType != PNG_COLOR_TYPE_RGB_ALPHA) {
        out.unsupported = colourTypeName(colourType);
        return true;
    }
    if (bitDepth != 8 && bitDepth != 16) {
        out.unsupported = "bit depth";
        return true;
    }
    if (width > png_uint_32(kMaxImageExtent) || height > png_uint_32(kMaxImageExtent) || width == 0 || height == 0) {
        out.unsupported = "size";
        return true;
    }
    if (interlace != PNG_INTERLACE_NONE) png_set_interlace_handling(png);
    png_read_update_info(png, info);
    const int channels = colourType == PNG_COLOR_TYPE_RGB_ALPHA ? 4 : 3;
    const std::size_t rowBytes = png_get_rowbytes(png, info);
    out.raw.resize(rowBytes * height);
    out.rows.resize(height);
    for (png_uint_32 y = 0; y < height; ++y) out.rows[y] = out.raw.data() + y * rowBytes;
    png_read_image(png, out.rows.data());
    png_read_end(png, nullptr);
    out.image = Image(int(width), int(height), channels, bitDepth);
    return true;
}

bool writeCore(png_structp png, png_infop info, std::FILE* file, PngErrors& errors, const Image& image,
               std::vector<png_bytep>& rows) {
    if (setjmp(errors.jump)) return false;
    png_init_io(png, file);
    png_set_IHDR(png, info, png_uint_32(image.width), png_uint_32(image.height), image.depth,
                 image.hasAlpha() ? PNG_COLOR_TYPE_RGB_ALPHA : PNG_COLOR_TYPE_RGB, PNG_INTERLACE_NONE,
                 PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    png_write_info(png, info);
    png_write_image(png, rows.data());
    png_write_end(png, nullptr);
    return true;
}

}  // namespace

Image readPng(std::FILE* file, const std::string& name) {
    PngErrors errors;
    png_structp png = png_create_read_struct(PNG_LIBPNG_VER_STRING, &errors, onPngError, onPngWarning);
    png_infop info = png ? png_create_info_struct(png) : nullptr;
    if (!info) {
        png_destroy_read_struct(&png, nullptr, nullptr);
        throw HostError(name, "out of memory reading PNG");
    }
    PngRead read;
    const bool ok = readCore(png, info, file, errors, read);
    png_destroy_read_struct(&png, &info, nullptr);
    if (!ok) throw HostError(name, std::string("broken PNG file: ") + errors.message);
    if (read.unsupported) {
        const std::string what = read.unsupported;
        if (what == "size") throw HostError(name, "image is empty or larger than 32767 in a dimension");
        if (what == "bit depth") throw HostError(name, "unsupported PNG bit depth (only 8 and 16 bits)");
        throw HostError(name, "unsupported PNG colour type: " + what + " (only RGB and RGBA)");
    }
    Image& image = read.image;
    if (image.depth == 16) {
        for (std::size_t i = 0; i < image.samples16.size(); ++i)
            image.samples16[i] = std::uint16_t((read.raw[i * 2] << 8) | read.raw[i * 2 + 1]);  // big-endian in the file
    } else {
        image.samples8 = std::move(read.raw);  // rows of whole pixels, no padding
    }
    return std::move(read.image);
}

void writePng(int fd, const std::string& name, const Image& image) {
    std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(fdopen(fd, "wb"), &std::fclose);
    if (!file) {
        ::close(fd);
        throw HostError(name, "cannot open output file");
    }
    const int bytes = image.depth / 8;
    const std::size_t rowBytes = std::size_t(image.width) * image.channels * bytes;
    std::vector<png_byte> raw;
    if (bytes == 2) {
        raw.resize(rowBytes * std::size_t(image.height));
        for (std::size_t i = 0; i < image.samples16.size(); ++i) {
            raw[i * 2] = png_byte(image.samples16[i] >> 8);
            raw[i * 2 + 1] = png_byte(image.samples16[i] & 0xFF);
        }
    } else {
        raw = image.samples8;
    }
    std::vector<png_bytep> rows(image.height);
    for (int y = 0; y < image.height; ++y) rows[y] = raw.data() + std::size_t(y) * rowBytes;

    PngErrors errors;
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, &errors, onPngError, onPngWarning);
    png_infop info = png ? png_create_info_struct(png) : nullptr;
    if (!info) {
        png_destroy_write_struct(&png, nullptr);
        throw HostError(name, "out of memory writing PNG");
    }
    const bool ok = writeCore(png, info, file.get(), errors, image, rows);
    png_destroy_write_struct(&png, &info);
    if (!ok) throw HostError(name, std::string("cannot write PNG: ") + errors.message);
    const bool flushed = std::fflush(file.get()) == 0 && !std::ferror(file.get());
    if (std::fclose(file.release()) != 0 || !flushed) throw HostError(name, "cannot write file (disk full?)");
}

}  // namespace noctiva::host::detail
