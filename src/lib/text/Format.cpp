#include "lib/text/Format.h"

#include <vector>

namespace vek::text {

std::string formatMessage(std::string_view pattern, std::initializer_list<std::string_view> args) {
    const std::vector<std::string_view> list(args);
    std::string out;
    out.reserve(pattern.size() + 32);
    size_t nextSequential = 0;
    for (size_t i = 0; i < pattern.size(); ++i) {
        const char c = pattern[i];
        if (c != '%' || i + 1 == pattern.size()) {
            out.push_back(c);
            continue;
        }
        const char marker = pattern[i + 1];
        if (marker == '%') {
            out.push_back('%');
            ++i;
        } else if (marker == '*' && nextSequential < list.size()) {
            out.append(list[nextSequential++]);
            ++i;
        } else if (marker >= '1' && marker <= '9' && static_cast<size_t>(marker - '1') < list.size()) {
            out.append(list[marker - '1']);
            ++i;
        } else {
            out.push_back(c);
        }
    }
    return out;
}

}  // namespace vek::text
