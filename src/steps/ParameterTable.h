// Every parameter of the shadow chain in settings-text order ("Parameter0" .. "Parameter57"), with a
// readable name, its default and what it does. Feeds the command's listing and --set, and the tests.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

struct cParameterInfo {
    int32_t number;           // N of "ParameterN"
    const char* name;         // "stepN.fieldName"
    int32_t defaultValue;
    const char* description;
};

constexpr size_t kShadowParameterCount = 58;

std::span<const cParameterInfo> shadowParameterTable();
// By readable name ("step2.mode") or by text name ("Parameter50"); null when unknown.
const cParameterInfo* findShadowParameter(std::string_view name);
