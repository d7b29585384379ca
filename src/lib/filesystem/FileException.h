// A file operation that failed, with the path and the reason in its message.
#pragma once

#include "lib/Exception.h"

namespace vek::filesystem {

class FileException : public CloneableException<FileException> {
public:
    using CloneableException::CloneableException;
};

}  // namespace vek::filesystem
