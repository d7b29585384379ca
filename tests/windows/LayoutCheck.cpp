// Compiled for Win64 by scripts/windows-build.sh: the header's static assertions of every offset and
// size must hold there too, and the ABI facts they rest on.
#include "hostapi/HostInterface.h"

static_assert(sizeof(long) == 4, "compiled for an LLP64 target");
static_assert(alignof(pi::FilterRecord) == 4, "FilterRecord is packed to 4");
static_assert(sizeof(pi::PlatformData) == 8);

int main() { return 0; }
