// Fills a message pattern: "%1".."%9" take the argument of that position, each "%*" takes the
// next argument in order, "%%" is a percent sign. Missing arguments leave the marker as it is.
#pragma once

#include <initializer_list>
#include <string>
#include <string_view>

namespace vek::text {

std::string formatMessage(std::string_view pattern, std::initializer_list<std::string_view> args);

}  // namespace vek::text
