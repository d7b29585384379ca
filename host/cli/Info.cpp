#include "Info.h"

#include <cstdio>

namespace noctiva::cli {

std::string fourCharacterCode(std::uint32_t code) {
    std::string text = "'";
    for (int shift = 24; shift >= 0; shift -= 8) {
        const unsigned char c = static_cast<unsigned char>(code >> shift);
        if (c >= 0x20 && c < 0x7F) {
            text += char(c);
        } else {
            char escaped[5];
            std::snprintf(escaped, sizeof escaped, "\\x%02X", unsigned(c));
            text += escaped;
        }
    }
    return text + "'";
}

void describeModuleInfo(const host::ModuleInfo& info, std::ostream& out) {
    const auto row = [&out](const char* label, const std::string& value) {
        out << label << std::string(15 - std::string(label).size(), ' ') << value << "\n";
    };
    row("name", "\"" + info.name + "\"");
    row("kind", fourCharacterCode(info.kind) + (info.kind == 0x3842464D ? " (filter)" : ""));
    row("category", "\"" + info.category + "\"" + (info.hidden() ? " (hidden: listed in no menu)" : ""));
    row("version", std::to_string(info.versionMajor) + "." + std::to_string(info.versionMinor));
    row("entry point", info.entryPoint);
    row("modes", info.supportedModesText());
    if (info.enable) row("enabled when", info.enable->text());
    if (info.filterLayer) row("filter layers", info.supportsFilterLayers() ? "supported" : "not supported");
    if (info.terminology)
        row("terminology", "class " + fourCharacterCode(info.terminology->classId) + ", event " +
                               fourCharacterCode(info.terminology->eventId) + ", AETE resource " +
                               std::to_string(info.terminology->terminologyId));
    if (info.event) {
        const host::AeteEvent& e = *info.event;
        row("scripting", "event \"" + e.name + "\" (" + fourCharacterCode(e.eventClass) + " " +
                             fourCharacterCode(e.eventId) + ") in suite \"" + e.suiteName + "\" " +
                             fourCharacterCode(e.suiteId));
        for (const host::AeteParameter& p : e.parameters)
            row("parameter", fourCharacterCode(p.key) + " \"" + p.name + "\", type " + fourCharacterCode(p.type));
    }
}

int printModuleInfo(const std::filesystem::path& module, std::ostream& out) {
    const host::ModuleInfo info = host::readModuleInfo(module);
    out << module.string() << "\n";
    describeModuleInfo(info, out);
    return 0;
}

}  // namespace noctiva::cli
