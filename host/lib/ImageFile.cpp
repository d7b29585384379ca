#include "noctiva/host/ImageFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#ifdef _WIN32
#include <io.h>
#include <windows.h>
#endif

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstring>
#include <memory>
#include <utility>

#include "ImageFileInternal.h"
#include "noctiva/host/Error.h"

namespace noctiva::host {

namespace fs = std::filesystem;

namespace {

struct FileCloser {
    void operator()(std::FILE* f) const { std::fclose(f); }
};

void checkExtent(const Image& image, const std::string& name) {
    if (image.width <= 0 || image.height <= 0) throw HostError(name, "image is empty");
    if (image.width > kMaxImageExtent || image.height > kMaxImageExtent)
        throw HostError(name, "image of " + std::to_string(image.width) + " x " + std::to_string(image.height) +
                                  " pixels is larger than 32767 in a dimension");
}

// A file in the target's folder that becomes the target on commit and disappears otherwise.
class TemporaryFile {
public:
    explicit TemporaryFile(const fs::path& target) : target_(target) {
        const fs::path folder = target.has_parent_path() ? target.parent_path() : fs::path(".");
        std::string pattern = (folder / ("." + target.filename().string() + ".XXXXXX")).string();
        fd_ = ::mkstemp(pattern.data());
#ifdef _WIN32
        if (fd_ >= 0) _setmode(fd_, _O_BINARY);
#endif
        if (fd_ < 0) throw HostError(target.string(), std::string("cannot create file: ") + std::strerror(errno));
        path_ = pattern;
    }
    ~TemporaryFile() {
        if (fd_ >= 0) ::close(fd_);
        if (!committed_) ::unlink(path_.c_str());
    }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;

    int release() { return std::exchange(fd_, -1); }  // the writer closes it
    void commit() {
#ifdef _WIN32
        // rename() does not replace an existing file on Windows.
        if (!MoveFileExW(fs::path(path_).c_str(), target_.c_str(), MOVEFILE_REPLACE_EXISTING))
            throw HostError(target_.string(), "cannot write file: error " + std::to_string(GetLastError()));
#else
        ::chmod(path_.c_str(), 0644);
        if (std::rename(path_.c_str(), target_.c_str()) != 0)
            throw HostError(target_.string(), std::string("cannot write file: ") + std::strerror(errno));
#endif
        committed_ = true;
    }

private:
    fs::path target_;
    std::string path_;
    int fd_ = -1;
    bool committed_ = false;
};

}  // namespace

bool formatFromExtension(const fs::path& path, FileFormat& format) {
    std::string ext = path.extension().string();
    std::transform(ext.begin(), ext.end(), ext.begin(), [](unsigned char c) { return char(std::tolower(c)); });
    if (ext == ".png") {
        format = FileFormat::Png;
        return true;
    }
    if (ext == ".tif" || ext == ".tiff") {
        format = FileFormat::Tiff;
        return true;
    }
    if (ext == ".pam") {
        format = FileFormat::Pam;
        return true;
    }
    return false;
}

LoadedImage loadImage(const fs::path& path) {
    const std::string name = path.string();
    std::error_code ec;
    if (fs::is_directory(path, ec)) throw HostError(name, "is a directory");
    std::unique_ptr<std::FILE, FileCloser> file(std::fopen(name.c_str(), "rb"));
    if (!file) throw HostError(name, std::string("cannot open: ") + std::strerror(errno));
    unsigned char magic[8] = {};
    const std::size_t got = std::fread(magic, 1, sizeof magic, file.get());
    if (got == 0) throw HostError(name, "file is empty");
    std::rewind(file.get());

    static const unsigned char pngMagic[8] = {0x89, 'P', 'N', 'G', '\r', '\n', 0x1A, '\n'};
    const bool isPng = got == 8 && std::memcmp(magic, pngMagic, 8) == 0;
    const bool isTiff = got >= 4 && ((magic[0] == 'I' && magic[1] == 'I' && (magic[2] == 42 || magic[2] == 43) && magic[3] == 0) ||
                                     (magic[0] == 'M' && magic[1] == 'M' && magic[2] == 0 && (magic[3] == 42 || magic[3] == 43)));
    const bool isPam = got >= 3 && magic[0] == 'P' && magic[1] == '7' && std::isspace(magic[2]);
    LoadedImage loaded;
    if (isPam) {
        loaded.format = FileFormat::Pam;
        loaded.image = detail::readPam(file.get(), name);
    } else if (isPng) {
        loaded.format = FileFormat::Png;
        loaded.image = detail::readPng(file.get(), name);
    } else if (isTiff) {
        file.reset();
        loaded.format = FileFormat::Tiff;
        loaded.image = detail::readTiff(name);
    } else {
        throw HostError(name, "not a PNG or TIFF file (nor a PAM file)");
    }
    checkExtent(loaded.image, name);
    if (loaded.image.depth == 16) {
        loaded.original16 = loaded.image.samples16;
        for (auto& s : loaded.image.samples16) s = hostFromFile16(s);
    }
    return loaded;
}

std::vector<std::uint16_t> fileSamples16(const Image& image, const std::vector<std::uint16_t>& original16) {
    std::vector<std::uint16_t> out(image.sampleCount());
    const bool haveOriginal = original16.size() == out.size();
    for (std::size_t i = 0; i < out.size(); ++i) {
        const std::uint16_t h = image.sample(i);
        out[i] = haveOriginal && hostFromFile16(original16[i]) == h ? original16[i] : fileFromHost16(h);
    }
    return out;
}

void saveImage(const fs::path& path, const Image& image, FileFormat format, const LoadedImage* source) {
    const std::string name = path.string();
    if ((image.channels != 3 && image.channels != 4) || (image.depth != 8 && image.depth != 16))
        throw HostError(name, "only RGB and RGBA images of 8 or 16 bits can be written");
    checkExtent(image, name);
    if (!image.samplesMatchSize())
        throw HostError(name, "image buffer does not match its size");

    Image fileImage;
    const Image* toWrite = &image;
    if (image.depth == 16) {
        fileImage = Image(image.width, image.height, image.channels, 16);
        const bool sameShape = source && source->image.width == image.width &&
                               source->image.height == image.height && source->image.channels == image.channels;
        fileImage.samples16 = fileSamples16(image, sameShape ? source->original16 : std::vector<std::uint16_t>{});
        toWrite = &fileImage;
    }

    TemporaryFile temporary(path);
    if (format == FileFormat::Pam) {
        const int fd = temporary.release();
        std::FILE* file = ::fdopen(fd, "wb");
        if (file == nullptr) ::close(fd);
        detail::writePam(file, name, *toWrite);
    } else if (format == FileFormat::Png) {
        detail::writePng(temporary.release(), name, *toWrite);
    } else {
        detail::writeTiff(temporary.release(), name, *toWrite);
    }
    temporary.commit();
}

}  // namespace noctiva::host
