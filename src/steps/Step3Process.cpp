// Step 3's variants: a fixed colour grade, saturation with a warm/cool bias, two midtone colour
// shifts, and toned grain. Every output pixel depends only on the same input pixel (and on rand()).
#include <array>
#include <cstddef>
#include <cstdlib>

#include "kernel/PixelBlock.h"
#include "steps/Step3.h"
#include "steps/Step34Support.h"

namespace {

using steps::clampSample;
using steps::mulSat;
using steps::saturate32;

// Saturation, offset and gain per channel; blue has no gain (0 here).
constexpr int64_t kGradeSaturation[3] = {125, 120, 150};
constexpr int64_t kGradeOffset[3] = {2560, -256, -1024};
constexpr int64_t kGradeGain[3] = {103, 101, 0};

void gradePass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, int64_t mix) {
    steps::walkPixels(src, dst, [mix](const int32_t* c, int32_t* out) {
        const int64_t m = (int64_t(c[0]) + c[1] + c[2]) / 3;
        for (int k = 0; k < 3; ++k) {
            const int64_t t = ((c[k] - m) * kGradeSaturation[k]) / 100;
            int64_t u = t + kGradeOffset[k] + m;
            if (kGradeGain[k] != 0) u = (u * kGradeGain[k]) / 100;
            const int64_t w = clampSample(((u - 32767) * 108) / 100 + 32767);
            // Not clamped: a mix outside 0..100 may overshoot. |w - c| < 2^32 and |mix| <= 2^31, so
            // the product fits in 64 bits; only the final value is held to the int range.
            out[k] = saturate32(c[k] + ((w - c[k]) * mix) / 100);
        }
    });
}

void saturationPass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, int64_t saturation, int64_t warmth) {
    const int64_t d[3] = {((warmth - 100) * 3840) / 100, ((warmth - 100) * 512) / 100,
                          ((100 - warmth) * 4352) / 100};
    steps::walkPixels(src, dst, [&d, saturation](const int32_t* c, int32_t* out) {
        const int64_t m = (int64_t(c[0]) + c[1] + c[2]) / 3;
        for (int k = 0; k < 3; ++k)
            out[k] = clampSample(mulSat(d[k] - m + c[k], saturation) / 100 + d[k] + m);
    });
}

// The midtone weight 2000 - q is never 0 for any 32-bit sample, so the strength can be folded into
// the amount beforehand: a saturated amount * strength still saturates with the right sign.
void shiftPass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, int64_t strength, const int64_t (&amount)[3]) {
    const int64_t scaled[3] = {mulSat(amount[0], strength), mulSat(amount[1], strength),
                               mulSat(amount[2], strength)};
    steps::walkPixels(src, dst, [&scaled](const int32_t* c, int32_t* out) {
        for (int k = 0; k < 3; ++k) {
            const int64_t e = (int64_t(c[k]) - 32768) >> 7;
            const int64_t q = (e * e) / 48;
            out[k] = clampSample(c[k] + mulSat(2000 - q, scaled[k]) / 2000);
        }
    });
}

using ToneTable = std::array<int32_t, 1024>;

// A parabola over the sample range, peaking at 500 * amount in the middle, in single precision.
void buildToning(ToneTable& table, int64_t amount) {
    const float a = float(amount);
    for (int i = 0; i < 1024; ++i) {
        const float x = (float(i) - 512.0f) * 0.001953125f;
        const float w = 500.0f - x * x * 500.0f;
        table[size_t(i)] = steps::truncToInt32(double(a * w));
    }
}

void grainPass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, const int64_t (&amount)[3]) {
    std::array<ToneTable, 3> t;
    for (int k = 0; k < 3; ++k) buildToning(t[size_t(k)], amount[k]);
    steps::walkPixels(src, dst, [&t](const int32_t* c, int32_t* out) {
        // One draw per channel, in channel order; the generator is never seeded here.
        for (int k = 0; k < 3; ++k) {
            int64_t v = int64_t(c[k]) + std::rand() % 256;
            // Only inner samples are toned, so pure black and white stay put; v >> 6 <= 1023 here.
            if (v >= 1 && v <= 65534) v += t[size_t(k)][size_t(v >> 6)];
            out[k] = clampSample(v);
        }
    });
}

}  // namespace

void cStep3::Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) {
    if (src == nullptr || dst == nullptr) return;
    switch (mode) {
        case 1:
            gradePass(src, dst, gradeMix);
            return;
        case 2:
            saturationPass(src, dst, saturationPercent, warmthPercent);
            return;
        case 3: {
            const int64_t base = int64_t(shiftBase3) - 228;
            const int64_t amount[3] = {shiftLevelR3 + base, shiftLevelG3 + base, shiftLevelB3 + base};
            shiftPass(src, dst, shiftStrength3, amount);
            return;
        }
        case 4: {
            const int64_t base = int64_t(shiftBase4) + 28;
            const int64_t amount[3] = {base - shiftLevelR4, base - shiftLevelG4, base - shiftLevelB4};
            shiftPass(src, dst, shiftStrength4, amount);
            return;
        }
        case 5: {
            // Channel weights of the four tonings; a selector outside 0..3 tones nothing (grain only).
            static constexpr int64_t kToning[4][3] = {{20, 10, -20}, {20, -24, 26}, {-20, 24, -26}, {-20, -10, 20}};
            const int32_t strengths[4] = {toneAmount0, toneAmount1, toneAmount2, toneAmount3};
            int64_t amount[3] = {0, 0, 0};
            if (toneSelector >= 0 && toneSelector <= 3)
                for (int k = 0; k < 3; ++k)
                    amount[k] = (kToning[toneSelector][k] * strengths[toneSelector]) / 100;
            grainPass(src, dst, amount);
            return;
        }
        default:
            // Anything else (including a stray 0 or a negative mode) hands the input on.
            src->copyTo(dst);
            return;
    }
}
