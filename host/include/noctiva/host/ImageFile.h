// PNG, TIFF and PAM files, 8 or 16 bits per channel, RGB or RGBA (the Windows host: PAM only).
//
// A 16-bit file keeps its original samples beside the host image. On output, every sample whose
// host value still equals the value it was loaded as is written with its original file value, so
// a filter that leaves a sample alone never changes it by the 16 -> 15 bit round trip.
#pragma once

#include <cstdint>
#include <filesystem>
#include <vector>

#include "noctiva/host/Image.h"

namespace noctiva::host {

enum class FileFormat { Png, Tiff, Pam };

struct LoadedImage {
    Image image;
    FileFormat format = FileFormat::Png;
    std::vector<std::uint16_t> original16;  // 16-bit files only: the file's samples, image order
};

// Throws HostError naming the file and the reason (unreadable, broken, unsupported layout).
LoadedImage loadImage(const std::filesystem::path& path);

// Writes through a temporary file in the target's folder and renames it into place, so a failure
// never leaves a partial file. `source` (optional) supplies the original 16-bit samples.
void saveImage(const std::filesystem::path& path, const Image& image, FileFormat format,
               const LoadedImage* source = nullptr);

// Format from the file name: ".png", ".tif", ".tiff", ".pam" (any case). Returns false for anything else.
bool formatFromExtension(const std::filesystem::path& path, FileFormat& format);

// The file samples to write for a 16-bit image (see above). Exposed for the tests.
std::vector<std::uint16_t> fileSamples16(const Image& image, const std::vector<std::uint16_t>& original16);

}  // namespace noctiva::host
