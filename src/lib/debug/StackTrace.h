// The calling thread's stack as text, one frame a line, for assertion records.
#pragma once

#include <cstddef>
#include <string>

namespace vek::debug {

std::string currentStackTrace(size_t skipFrames = 0, size_t maxFrames = 32);

}  // namespace vek::debug
