// Named settings that show what the stages do. Each preset is a list of parameter changes on top
// of the defaults; its settings text is the full 58-entry text with those changes.
#pragma once

#include <cstdint>
#include <ostream>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace noctiva::cli {

struct PresetChange {
    const char* parameter;  // readable name from the parameter table
    std::int32_t value;
};

struct Preset {
    const char* name;
    const char* summary;
    std::vector<PresetChange> changes;
};

std::span<const Preset> presets();
const Preset* findPreset(std::string_view name);  // null when unknown
std::string presetSettingsText(const Preset& preset);

// One block per preset: name, summary, the changes as NAME=VALUE.
void listPresets(std::ostream& out);

}  // namespace noctiva::cli
