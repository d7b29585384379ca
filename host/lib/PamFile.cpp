// PAM (P7): RGB or RGB_ALPHA, maxval 255 or 65535, samples big-endian. The Windows host's only
// format (there is no Windows libpng or libtiff in Debian); the Linux host reads and writes it too,
// so images move between the two losslessly.
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <string>

#include "ImageFileInternal.h"
#include "noctiva/host/Error.h"

namespace noctiva::host::detail {

namespace {

struct FileCloser {
    void operator()(std::FILE* f) const { std::fclose(f); }
};

// The next header token; comments run to the end of the line.
std::string token(std::FILE* file) {
    std::string t;
    int c;
    while ((c = std::fgetc(file)) != EOF) {
        if (c == '#') {
            while ((c = std::fgetc(file)) != EOF && c != '\n') {
            }
            if (!t.empty()) break;
        } else if (c == ' ' || c == '\t' || c == '\r' || c == '\n') {
            if (!t.empty()) break;
        } else {
            t += char(c);
            if (t.size() > 64) break;
        }
    }
    return t;
}

int headerNumber(std::FILE* file, const std::string& name, const char* field) {
    const std::string t = token(file);
    if (t.empty() || t.size() > 9 || t.find_first_not_of("0123456789") != std::string::npos)
        throw HostError(name, std::string("PAM header: bad ") + field);
    return std::stoi(t);
}

}  // namespace

Image readPam(std::FILE* file, const std::string& name) {
    if (token(file) != "P7") throw HostError(name, "not a PAM file");
    int width = -1, height = -1, depth = -1, maxval = -1;
    std::string tupleType;
    for (;;) {
        const std::string key = token(file);
        if (key.empty()) throw HostError(name, "PAM header has no ENDHDR");
        if (key == "ENDHDR") break;
        if (key == "WIDTH") width = headerNumber(file, name, "WIDTH");
        else if (key == "HEIGHT") height = headerNumber(file, name, "HEIGHT");
        else if (key == "DEPTH") depth = headerNumber(file, name, "DEPTH");
        else if (key == "MAXVAL") maxval = headerNumber(file, name, "MAXVAL");
        else if (key == "TUPLTYPE") tupleType = token(file);
        else throw HostError(name, "PAM header: unknown field " + key);
    }
    if (width <= 0 || height <= 0) throw HostError(name, "PAM header: missing or zero size");
    if (width > kMaxImageExtent || height > kMaxImageExtent)
        throw HostError(name, "image of " + std::to_string(width) + " x " + std::to_string(height) +
                                  " pixels is larger than 32767 in a dimension");
    if (!((depth == 3 && (tupleType.empty() || tupleType == "RGB")) ||
          (depth == 4 && (tupleType.empty() || tupleType == "RGB_ALPHA"))))
        throw HostError(name, "only RGB and RGB_ALPHA PAM files are supported");
    if (maxval != 255 && maxval != 65535) throw HostError(name, "only PAM files of maxval 255 or 65535 are supported");

    Image image(width, height, depth, maxval == 255 ? 8 : 16);
    const std::size_t bytesPerSample = image.depth == 8 ? 1 : 2;
    std::vector<unsigned char> row(std::size_t(width) * std::size_t(depth) * bytesPerSample);
    std::size_t at = 0;
    for (int y = 0; y < height; ++y) {
        if (std::fread(row.data(), 1, row.size(), file) != row.size()) throw HostError(name, "PAM file is truncated");
        for (std::size_t i = 0; i < row.size(); i += bytesPerSample)
            image.setSample(at++, bytesPerSample == 1 ? row[i] : std::uint16_t((row[i] << 8) | row[i + 1]));
    }
    return image;
}

void writePam(std::FILE* raw, const std::string& name, const Image& image) {
    std::unique_ptr<std::FILE, FileCloser> file(raw);
    if (!file) throw HostError(name, std::string("cannot write file: ") + std::strerror(errno));
    const bool wide = image.depth == 16;
    const std::string header = "P7\nWIDTH " + std::to_string(image.width) + "\nHEIGHT " + std::to_string(image.height) +
                               "\nDEPTH " + std::to_string(image.channels) + "\nMAXVAL " + (wide ? "65535" : "255") +
                               "\nTUPLTYPE " + (image.channels == 4 ? "RGB_ALPHA" : "RGB") + "\nENDHDR\n";
    std::vector<unsigned char> bytes;
    if (wide) {
        bytes.reserve(image.samples16.size() * 2);
        for (const std::uint16_t s : image.samples16) {
            bytes.push_back((unsigned char)(s >> 8));
            bytes.push_back((unsigned char)s);
        }
    } else {
        bytes = image.samples8;
    }
    const bool ok = std::fwrite(header.data(), 1, header.size(), file.get()) == header.size() &&
                    std::fwrite(bytes.data(), 1, bytes.size(), file.get()) == bytes.size();
    std::FILE* f = file.release();
    if (std::fclose(f) != 0 || !ok) throw HostError(name, std::string("cannot write file: ") + std::strerror(errno));
}

}  // namespace noctiva::host::detail

#if NOCTIVA_HOST_PAM_ONLY
// This build has no PNG or TIFF library.
namespace noctiva::host::detail {
Image readPng(std::FILE*, const std::string& name) { throw HostError(name, "this build reads PAM files only"); }
Image readTiff(const std::string& path) { throw HostError(path, "this build reads PAM files only"); }
void writePng(int fd, const std::string& name, const Image&) {
    ::close(fd);
    throw HostError(name, "this build writes PAM files only");
}
void writeTiff(int fd, const std::string& name, const Image&) {
    ::close(fd);
    throw HostError(name, "this build writes PAM files only");
}
}  // namespace noctiva::host::detail
#endif
