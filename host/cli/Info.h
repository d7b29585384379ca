// `noctiva info MODULE`: what a module file declares about itself in its PIPL and AETE.
#pragma once

#include <filesystem>
#include <ostream>
#include <string>

#include "noctiva/host/ModuleInfo.h"

namespace noctiva::cli {

// "'8BFM'": a four-character code as text; bytes outside printable ASCII are shown as \xNN.
std::string fourCharacterCode(std::uint32_t code);

void describeModuleInfo(const host::ModuleInfo& info, std::ostream& out);

// Reads the module file without loading it and prints the description. Throws host::HostError.
int printModuleInfo(const std::filesystem::path& module, std::ostream& out);

}  // namespace noctiva::cli
