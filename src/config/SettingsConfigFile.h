// The plug-in's per-user settings: "Quell2.cfg" in "Corvid/Quell 2" under the user's
// preferences folder. Loaded (or created empty) on construction, written back on destruction.
#pragma once

#include "config/Configuration.h"

namespace vek {

class SettingsConfigFile : public plugin_common::Configuration {
public:
    SettingsConfigFile();
    ~SettingsConfigFile() override;
};

}  // namespace vek
