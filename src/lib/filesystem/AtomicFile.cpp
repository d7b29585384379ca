#include "lib/filesystem/AtomicFile.h"

#include <cerrno>
#include <cstring>
#include <fstream>
#include <system_error>

#include "lib/filesystem/FileException.h"

#ifdef _WIN32
#include <windows.h>
#else
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#endif

namespace fs = std::filesystem;

namespace vek::filesystem {
namespace {

[[noreturn]] void fail(const fs::path& path, std::string_view what, int error) {
    std::string message = "'" + path.string() + "': " + std::string(what);
    if (error) message += ": " + std::generic_category().message(error);
    throw FileException(message);
}

void prepareFolder(const fs::path& target, bool createFolders) {
    const fs::path folder = target.parent_path();
    if (!createFolders || folder.empty()) return;
    std::error_code ec;
    fs::create_directories(folder, ec);
    if (ec) fail(folder, "cannot create the folder", ec.value());
}

#ifndef _WIN32

// Closes the descriptor and removes the temporary file unless released.
class TemporaryFile {
public:
    explicit TemporaryFile(const fs::path& target) : name_(target.string() + ".tmp-XXXXXX") {
        fd_ = mkostemp(name_.data(), O_CLOEXEC);
        if (fd_ < 0) fail(target, "cannot create a temporary file beside it", errno);
    }
    ~TemporaryFile() {
        if (fd_ >= 0) ::close(fd_);
        if (!committed_) ::unlink(name_.c_str());
    }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;

    int fd() const { return fd_; }
    const std::string& name() const { return name_; }
    int close() {
        const int rc = ::close(fd_);
        fd_ = -1;
        return rc;
    }
    void commit() { committed_ = true; }

private:
    std::string name_;
    int fd_ = -1;
    bool committed_ = false;
};

void syncFolder(const fs::path& target) {
    // Makes the rename itself durable; failing here loses nothing already written.
    const fs::path folder = target.has_parent_path() ? target.parent_path() : fs::path(".");
    const int dfd = ::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (dfd < 0) return;
    ::fsync(dfd);
    ::close(dfd);
}

#endif

}  // namespace

#ifndef _WIN32

void writeFileAtomically(const fs::path& target, std::string_view content, bool createFolders) {
    prepareFolder(target, createFolders);
    TemporaryFile temp(target);

    // Keep the old file's permissions; a new file gets the usual rw-r--r--.
    struct stat old {};
    const mode_t mode = ::stat(target.c_str(), &old) == 0 ? (old.st_mode & 07777) : 0644;
    ::fchmod(temp.fd(), mode);

    const char* data = content.data();
    size_t left = content.size();
    while (left > 0) {
        const ssize_t n = ::write(temp.fd(), data, left);
        if (n < 0) {
            if (errno == EINTR) continue;
            fail(target, "cannot write the temporary file", errno);
        }
        data += n;
        left -= static_cast<size_t>(n);
    }
    if (::fsync(temp.fd()) != 0) fail(target, "cannot flush the temporary file", errno);
    if (temp.close() != 0) fail(target, "cannot close the temporary file", errno);
    if (::rename(temp.name().c_str(), target.c_str()) != 0) fail(target, "cannot replace the file", errno);
    temp.commit();
    syncFolder(target);
}

#else

void writeFileAtomically(const fs::path& target, std::string_view content, bool createFolders) {
    prepareFolder(target, createFolders);
    fs::path temp = target;
    temp += L".tmp-" + std::to_wstring(GetCurrentProcessId());
    {
        std::ofstream out(temp, std::ios::binary | std::ios::trunc);
        if (!out) fail(target, "cannot create a temporary file beside it", 0);
        out.write(content.data(), static_cast<std::streamsize>(content.size()));
        out.close();
        if (!out) {
            std::error_code ignored;
            fs::remove(temp, ignored);
            fail(target, "cannot write the temporary file", 0);
        }
    }
    if (!MoveFileExW(temp.c_str(), target.c_str(), MOVEFILE_REPLACE_EXISTING | MOVEFILE_WRITE_THROUGH)) {
        std::error_code ignored;
        fs::remove(temp, ignored);
        fail(target, "cannot replace the file", 0);
    }
}

#endif

std::string readWholeFile(const fs::path& path, size_t maxBytes) {
    std::error_code ec;
    const auto status = fs::status(path, ec);
    if (ec || !fs::exists(status)) fail(path, "no such file", ec ? ec.value() : ENOENT);
    if (!fs::is_regular_file(status)) fail(path, "not a regular file", 0);
    const auto size = fs::file_size(path, ec);
    if (ec) fail(path, "cannot read the file size", ec.value());
    if (size > maxBytes) fail(path, "file too large", 0);

    std::ifstream in(path, std::ios::binary);
    if (!in) fail(path, "cannot open the file", errno);
    std::string content;
    content.reserve(static_cast<size_t>(size));
    // Read to the end rather than trusting the size: the file may change meanwhile.
    char buffer[65536];
    while (in.read(buffer, sizeof buffer) || in.gcount() > 0) {
        content.append(buffer, static_cast<size_t>(in.gcount()));
        if (content.size() > maxBytes) fail(path, "file too large", 0);
    }
    if (in.bad()) fail(path, "cannot read the file", errno);
    return content;
}

}  // namespace vek::filesystem
