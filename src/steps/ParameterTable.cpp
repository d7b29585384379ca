#include "steps/ParameterTable.h"

#include <array>
#include <charconv>

namespace {

// Text order: the walk goes from the last step upstream, each step's own fields first, then its mode.
constexpr std::array<cParameterInfo, kShadowParameterCount> kTable{{
    {0, "step4.blackLevel1", 0, "mode 1: black level, halved onto 0..255"},
    {1, "step4.whiteLevel1", 0, "mode 1: white level counted down from the top, halved"},
    {2, "step4.curveStrength2", 0, "mode 2: amplitude of the sine tone curve"},
    {3, "step4.blackLevel2", 0, "mode 2: black level, halved"},
    {4, "step4.whiteLevel2", 0, "mode 2: white level, halved"},
    {5, "step4.gradientLevel3", 0, "mode 3: total of black and white level, shared out from top to bottom"},
    {6, "step4.curveStrength3", 0, "mode 3: amplitude of the inverted sine curve"},
    {7, "step4.blackPoint5", 0, "modes 4, 5: black point in percent of 25000"},
    {8, "step4.whitePoint5", 100, "modes 4, 5: white point; 100 = none, each unit below lowers it by 400"},
    {9, "step4.toneRed5", 50, "modes 4, 5: toning towards red (and half towards green); 50 = none"},
    {10, "step4.toneBlue5", 50, "modes 4, 5: toning towards blue (and half towards green); 50 = none"},
    {11, "step4.toneSelector4", 0, "mode 4: 0 = lift, 1 = darken, other = the mode-5 toning"},
    {12, "step4.liftAmount4", 50, "mode 4, selector 0: strength of the lift"},
    {13, "step4.darkenAmount4", 50, "mode 4, selector 1: strength of the darkening"},
    {14, "step4.mode", 0, "step 4 variant on RGB (levels, tone curves, grain); 0 bypasses the step"},
    {15, "step3.gradeMix", 20, "mode 1: percent of the graded value mixed into the pixel"},
    {16, "step3.saturationPercent", 100, "mode 2: saturation in percent (100 = unchanged)"},
    {17, "step3.warmthPercent", 100, "mode 2: colour bias (100 = none, above warmer, below cooler)"},
    {18, "step3.shiftStrength3", 100, "mode 3: overall strength of the midtone shift"},
    {19, "step3.shiftBase3", 100, "mode 3: common level added to the three channel levels"},
    {20, "step3.shiftLevelR3", 220, "mode 3: level of red"},
    {21, "step3.shiftLevelG3", 180, "mode 3: level of green"},
    {22, "step3.shiftLevelB3", 40, "mode 3: level of blue"},
    {23, "step3.shiftStrength4", 100, "mode 4: overall strength of the midtone shift"},
    {24, "step3.shiftBase4", 100, "mode 4: common level from which the channel levels are subtracted"},
    {25, "step3.shiftLevelR4", 220, "mode 4: level of red"},
    {26, "step3.shiftLevelG4", 180, "mode 4: level of green"},
    {27, "step3.shiftLevelB4", 40, "mode 4: level of blue"},
    {28, "step3.toneSelector", 0, "mode 5: which of the four tonings (0..3)"},
    {29, "step3.toneAmount0", 50, "mode 5: strength of toning 0"},
    {30, "step3.toneAmount1", 50, "mode 5: strength of toning 1"},
    {31, "step3.toneAmount2", 50, "mode 5: strength of toning 2"},
    {32, "step3.toneAmount3", 50, "mode 5: strength of toning 3"},
    {33, "step3.mode", 0, "step 3 variant on RGB (colour grade, saturation, shifts, toned grain); 0 bypasses"},
    {34, "step2.impulseLevel", 55, "mode 1: impulse offset = (10 - value / 4) * 256"},
    {35, "step2.impulseFlatness", 70, "mode 1: flatness limit = 50 - value / 2"},
    {36, "step2.lumaMedianRadius", 1, "mode 2: radius of the L median"},
    {37, "step2.lumaMedianKeep", 8, "mode 2: median threshold = 31 - value"},
    {38, "step2.rankPreset3", 2, "mode 3: row of the rank-filter presets"},
    {39, "step2.smoothThreshold4", 5, "mode 4: median threshold = value + k + 1"},
    {40, "step2.smoothStrength4", 50, "mode 4: k = 10 - value / 10"},
    {41, "step2.edgeLimit5", 15, "mode 5: edge threshold = value / 2, in units of 256"},
    {42, "step2.lumaKeepPercent5", 70, "mode 5: percent of the input L kept"},
    {43, "step2.rankPreset6", 0, "mode 6: row of the rank-filter presets"},
    {44, "step2.colourTolerance7", 100, "mode 7: colour tolerance q = 2 * value / 3"},
    {45, "step2.waveletStrength7", 100, "mode 7: wavelet threshold h = value / 2"},
    {46, "step2.referenceRed7", 40, "mode 7: reference colour, red in units of 256"},
    {47, "step2.referenceGreen7", 50, "mode 7: reference colour, green in units of 256"},
    {48, "step2.referenceBlue7", 70, "mode 7: reference colour, blue in units of 256"},
    {49, "step2.preset9", 0, "mode 9: preset of the layered smoothing and wavelet shrinkage"},
    {50, "step2.mode", 104, "step 2 variant on Lab (impulse, median, rank, blur, wavelet); 104 = blur 6 px, keep 2/3 of L; 0 bypasses"},
    {51, "step1.medianRadius1", 4, "mode 1: chroma median radius"},
    {52, "step1.medianRadius2", 5, "mode 2: chroma median radius"},
    {53, "step1.chromaLimitPercent", 75, "mode 2: chroma limit = (100 - value) * 128"},
    {54, "step1.edgeStrength", 100, "modes 4, 105: scale of the grid edge thresholds (60x and 300x)"},
    {55, "step1.medianRadius4", 4, "mode 4: chroma median radius"},
    {56, "step1.preset3", 0, "mode 3: radius and limit preset"},
    {57, "step1.mode", 0, "step 1 variant on Lab (chroma medians, grid edge smoothing); 0 bypasses the step"},
}};

constexpr bool numberedInOrder() {
    for (size_t i = 0; i < kTable.size(); ++i)
        if (kTable[i].number != int32_t(i)) return false;
    return true;
}
static_assert(numberedInOrder(), "the table's numbers are its text order");

}  // namespace

std::span<const cParameterInfo> shadowParameterTable() { return kTable; }

const cParameterInfo* findShadowParameter(std::string_view name) {
    for (const auto& entry : kTable)
        if (name == entry.name) return &entry;
    constexpr std::string_view prefix = "Parameter";
    if (name.size() > prefix.size() && name.substr(0, prefix.size()) == prefix) {
        int32_t number = -1;
        const char* first = name.data() + prefix.size();
        const char* last = name.data() + name.size();
        auto [end, error] = std::from_chars(first, last, number);
        if (error == std::errc() && end == last && number >= 0 && size_t(number) < kTable.size())
            return &kTable[size_t(number)];
    }
    return nullptr;
}
