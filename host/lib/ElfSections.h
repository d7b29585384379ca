// Named sections of a 64-bit little-endian ELF file, read without loading it.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace noctiva::host {

// The contents of each named section, in the order asked (nullopt for a section the file lacks).
// Every offset and size in the file is checked against the file's size. Throws
// HostError(path, reason) for a file that is not a well-formed ELF64 little-endian file.
std::vector<std::optional<std::vector<std::uint8_t>>> readElfSections(const std::filesystem::path& path,
                                                                      const std::vector<std::string>& names);

}  // namespace noctiva::host
