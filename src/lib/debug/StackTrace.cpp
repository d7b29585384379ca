#include "lib/debug/StackTrace.h"

#include <boost/stacktrace.hpp>

namespace vek::debug {

std::string currentStackTrace(size_t skipFrames, size_t maxFrames) {
    try {
        // +1 hides this function itself.
        return boost::stacktrace::to_string(boost::stacktrace::stacktrace(skipFrames + 1, maxFrames));
    } catch (...) {
        return "(no stack trace)";
    }
}

}  // namespace vek::debug
