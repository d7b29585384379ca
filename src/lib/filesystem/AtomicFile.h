// Whole-file reads and crash-safe whole-file writes.
#pragma once

#include <cstddef>
#include <filesystem>
#include <string>
#include <string_view>

namespace vek::filesystem {

// Replaces the file's content so that at every moment the path holds either the complete old
// content or the complete new one: the text goes to a temporary file in the same folder, is
// flushed to the disk and then renamed over the target. On failure the temporary file is
// removed, the old file stays as it was, and FileException says why. `createFolders` creates
// missing parent folders first.
void writeFileAtomically(const std::filesystem::path& target, std::string_view content, bool createFolders);

// Reads a regular file whole. Throws FileException when it is missing, not a regular file,
// larger than maxBytes or unreadable.
std::string readWholeFile(const std::filesystem::path& path, size_t maxBytes);

}  // namespace vek::filesystem
