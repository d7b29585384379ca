// Puts the generated resources into named sections of the module file, where a host finds them
// without loading or running the module.
#include "plugin/Resources.h"

namespace {
[[gnu::used, gnu::section("PIPL")]] constexpr auto kPIPLSection = resources::buildPIPL();
[[gnu::used, gnu::section("AETE")]] constexpr auto kAETESection = resources::buildAETE();
}  // namespace
