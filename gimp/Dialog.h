// The interactive dialog: pick a preset or edit the settings text.
//
// GTK 3, not libgimpui: libgimpui brings GTK 2, and the module loaded into this process brings
// GTK 3 through its message dialog; the two cannot share a process.
#pragma once

#include <optional>
#include <stdexcept>

#include "Choice.h"

namespace noctiva::gimp {

// None when the user cancels. Throws std::runtime_error when there is no display to show it on.
std::optional<Choice> runDialog(const Choice& initial);

}  // namespace noctiva::gimp
