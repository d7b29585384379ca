// Format back ends of ImageFile.cpp. Each throws HostError(name, reason) on failure.
#pragma once

#include <cstdio>
#include <string>

#include "noctiva/host/ImageFile.h"

namespace noctiva::host::detail {

// Reads an image; 16-bit samples come back as file values (0..65535) in `image.samples`.
Image readPng(std::FILE* file, const std::string& name);
Image readTiff(const std::string& path);
Image readPam(std::FILE* file, const std::string& name);

// `image` holds file values; the file descriptor is consumed (closed) in every case.
void writePng(int fd, const std::string& name, const Image& image);
void writeTiff(int fd, const std::string& name, const Image& image);
// Takes ownership of `file` (binary mode) and closes it in every case.
void writePam(std::FILE* file, const std::string& name, const Image& image);

}  // namespace noctiva::host::detail
