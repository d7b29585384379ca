// Forced into every Windows translation unit by cmake/mingw-w64.cmake: PE has no ifunc, so GCC
// cannot dispatch target_clones; emptying the attribute leaves the baseline code.
#pragma once
#define target_clones(...)
