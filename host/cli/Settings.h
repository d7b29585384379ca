// The settings text ('par1') the command hands to the module, built from readable parameter names.
//
// The text is the signature "vek " followed by one entry per parameter, " ParameterN value ", for
// N = 0..57 in order, so consecutive entries are separated by two blanks.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include "steps/ParameterTable.h"

namespace noctiva::cli {

using ParameterValues = std::array<std::int32_t, kShadowParameterCount>;

// One `--set NAME=VALUE`, already checked against the table.
struct Assignment {
    std::size_t number = 0;  // index into the table
    std::int32_t value = 0;
};

ParameterValues defaultParameterValues();

// Reads a settings text the way the module reads it: each "ParameterN" is searched as a plain
// substring from where the previous match ended, its value parsed like strtol (no digits = 0), and
// a missing entry keeps its current value. Returns false (and changes nothing) when the text lacks
// the signature ("vek ", or the same four bytes reversed).
bool readSettingsText(std::string_view text, ParameterValues& values);

// The complete 58-entry text.
std::string writeSettingsText(const ParameterValues& values);

// Parses "NAME=VALUE": NAME is a readable name ("step2.mode") or a text name ("Parameter50"),
// VALUE a decimal int32. Throws std::invalid_argument with a one-line reason.
Assignment parseAssignment(std::string_view text);

// The text the module gets: `base` (absent = the defaults) with every assignment applied in order,
// written out complete. Without assignments the base passes through untouched (absent stays
// absent: the module then keeps its own defaults). Throws std::invalid_argument when assignments
// are to be applied to a base text without the signature.
std::optional<std::string> composeSettingsText(const std::optional<std::string>& base,
                                               const std::vector<Assignment>& assignments);

// The parameter table as a Markdown table: number, name, default, what it does.
void listParameters(std::ostream& out);

}  // namespace noctiva::cli
