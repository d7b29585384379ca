// Module-wide state, written at the start of every entry call (About excepted). The host calls the
// module from one thread, so nothing here is guarded.
#pragma once

#include <cstdint>

#include "hostapi/HostInterface.h"

namespace plugin {

extern pi::FilterRecord* gFilterRecord;
extern intptr_t* gData;
extern pi::int16* gResult;

}  // namespace plugin
