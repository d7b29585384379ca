#include "plugin/PluginState.h"

namespace plugin {
pi::FilterRecord* gFilterRecord = nullptr;
intptr_t* gData = nullptr;
pi::int16* gResult = nullptr;
}  // namespace plugin
