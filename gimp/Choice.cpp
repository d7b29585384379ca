#include "Choice.h"

#include <cstdint>
#include <cstring>
#include <stdexcept>

#include "Presets.h"

namespace noctiva::gimp {

namespace {

constexpr char kMagic[4] = {'N', 'C', 'V', '1'};

void putString(std::vector<char>& out, const std::string& s) {
    const auto size = std::uint32_t(s.size());
    const char* p = reinterpret_cast<const char*>(&size);
    out.insert(out.end(), p, p + sizeof size);
    out.insert(out.end(), s.begin(), s.end());
}

bool takeString(std::span<const char>& in, std::string& s) {
    std::uint32_t size = 0;
    if (in.size() < sizeof size) return false;
    std::memcpy(&size, in.data(), sizeof size);
    in = in.subspan(sizeof size);
    if (in.size() < size) return false;
    s.assign(in.data(), size);
    in = in.subspan(size);
    return true;
}

}  // namespace

std::optional<std::string> settingsTextFor(const Choice& choice) {
    if (!choice.preset.empty() && !choice.settings.empty())
        throw std::invalid_argument("give either a preset or a settings text, not both");
    if (!choice.settings.empty()) return choice.settings;
    if (choice.preset.empty()) return std::nullopt;
    const noctiva::cli::Preset* preset = noctiva::cli::findPreset(choice.preset);
    if (preset == nullptr) {
        std::string known;
        for (const auto& p : noctiva::cli::presets()) known += (known.empty() ? "" : ", ") + std::string(p.name);
        throw std::invalid_argument("unknown preset \"" + choice.preset + "\" (known: " + known + ")");
    }
    return noctiva::cli::presetSettingsText(*preset);
}

std::vector<char> encodeChoice(const Choice& choice) {
    std::vector<char> out(std::begin(kMagic), std::end(kMagic));
    putString(out, choice.preset);
    putString(out, choice.settings);
    return out;
}

std::optional<Choice> decodeChoice(std::span<const char> bytes) {
    if (bytes.size() < sizeof kMagic || std::memcmp(bytes.data(), kMagic, sizeof kMagic) != 0) return std::nullopt;
    bytes = bytes.subspan(sizeof kMagic);
    Choice choice;
    if (!takeString(bytes, choice.preset) || !takeString(bytes, choice.settings) || !bytes.empty())
        return std::nullopt;
    return choice;
}

}  // namespace noctiva::gimp
