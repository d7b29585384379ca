// The real module, loaded once per test program, and settings texts built from the parameter table.
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "noctiva/host/Module.h"
#include "steps/ParameterTable.h"

namespace testsupport {

inline const noctiva::host::Module& noctivaModule() {
    static const noctiva::host::Module m(NOCTIVA_MODULE_PATH);
    return m;
}

// A full settings text: each parameter's value from `value(number, default)`.
template <class Value>
std::string settingsText(Value value) {
    std::string text = "vek ";
    for (const cParameterInfo& p : shadowParameterTable())
        text += " Parameter" + std::to_string(p.number) + " " + std::to_string(value(p.number, p.defaultValue)) + " ";
    return text;
}

// The defaults with some parameters overridden by number.
inline std::string settingsWith(const std::map<int, std::int32_t>& overrides) {
    return settingsText([&](int number, std::int32_t fallback) {
        const auto it = overrides.find(number);
        return it == overrides.end() ? fallback : it->second;
    });
}

}  // namespace testsupport
