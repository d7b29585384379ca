// What the user or a script picked: a preset name or a settings text ('par1'), never both.
#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

namespace noctiva::gimp {

struct Choice {
    std::string preset;    // a preset of the `noctiva` command; empty = none
    std::string settings;  // a settings text; empty = none
    bool operator==(const Choice&) const = default;
};

// The text the module gets as 'par1'; none = the module's own defaults. Throws
// std::invalid_argument for an unknown preset or when both a preset and a text are given.
std::optional<std::string> settingsTextFor(const Choice& choice);

// The bytes kept with gimp_set_data between runs, and back. Bytes of another layout (an older
// plug-in, a truncated record) read as none, so the defaults apply.
std::vector<char> encodeChoice(const Choice& choice);
std::optional<Choice> decodeChoice(std::span<const char> bytes);

}  // namespace noctiva::gimp
