// A malformed configuration document; raised by the parser and caught by the loaders.
#pragma once

#include "lib/Exception.h"

namespace vek::plugin_common {

class ConfigurationException : public CloneableException<ConfigurationException> {
public:
    using CloneableException::CloneableException;
};

}  // namespace vek::plugin_common
