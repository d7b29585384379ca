#include "Presets.h"

#include <stdexcept>

#include "Settings.h"

namespace noctiva::cli {

namespace {

const std::vector<Preset>& table() {
    static const std::vector<Preset> kPresets{
        {"default", "the module's own settings: step 2 blurs colour strongly and keeps 2/3 of the luminance", {}},
        {"chroma-strong",
         "strong colour-noise clean-up: a wide chroma median in step 1, then step 2 blurs and keeps half "
         "the luminance",
         {{"step1.mode", 1}, {"step1.medianRadius1", 6}, {"step2.mode", 100}}},
        {"impulse",
         "luminance impulse removal: step 2 pulls single bright or dark specks towards their neighbours, "
         "colour untouched",
         {{"step2.mode", 1}}},
        {"rank", "luminance rank filter: step 2 replaces outliers by a ranked neighbour (preset row 3)",
         {{"step2.mode", 3}, {"step2.rankPreset3", 3}}},
        {"wavelet", "noise shrunk in a five-level wavelet decomposition instead of blurred (step 2 mode 102)",
         {{"step2.mode", 102}}},
        {"grade-grain",
         "a look: default clean-up, then step 3 saturates and warms, step 4 adds grain with a red toning "
         "and firmer black and white points",
         {{"step3.mode", 2},
          {"step3.saturationPercent", 120},
          {"step3.warmthPercent", 115},
          {"step4.mode", 5},
          {"step4.blackPoint5", 4},
          {"step4.whitePoint5", 96},
          {"step4.toneRed5", 65}}},
    };
    return kPresets;
}

}  // namespace

std::span<const Preset> presets() { return table(); }

const Preset* findPreset(std::string_view name) {
    for (const Preset& p : table())
        if (name == p.name) return &p;
    return nullptr;
}

std::string presetSettingsText(const Preset& preset) {
    ParameterValues values = defaultParameterValues();
    for (const PresetChange& c : preset.changes) {
        const cParameterInfo* info = findShadowParameter(c.parameter);
        if (info == nullptr) throw std::logic_error(std::string("preset names unknown parameter ") + c.parameter);
        values[std::size_t(info->number)] = c.value;
    }
    return writeSettingsText(values);
}

void listPresets(std::ostream& out) {
    for (const Preset& p : table()) {
        out << p.name << "\n    " << p.summary << "\n    ";
        if (p.changes.empty()) out << "(no changes)";
        for (std::size_t i = 0; i < p.changes.size(); ++i)
            out << (i ? " " : "") << p.changes[i].parameter << "=" << p.changes[i].value;
        out << "\n";
    }
}

}  // namespace noctiva::cli
