// Step 4's variants: levels with half their colour shift, levels with a sine tone curve, levels
// graduated over the filter rectangle's height, and grain with black/white points and tone curves.
#include <array>
#include <cmath>
#include <cstddef>
#include <cstdlib>

#include "kernel/Host.h"
#include "kernel/PixelBlock.h"
#include "steps/Step34Support.h"
#include "steps/Step4.h"

namespace {

using steps::clampSample;
using steps::mulSat;

// Levels on the 0..255 scale: black level B maps to 0, 256 - W to 65536, the gain in 1/1024.
// B + W = 256 (black point on the white point) has no gain at all; that stage is left out (the
// identity) instead of dividing by zero. Every product stays far inside 64 bits: a non-zero gain
// needs |256 - B - W| <= 262144.
struct Levels {
    int64_t gain = 1024;
    int64_t offset = 0;

    Levels(int64_t black, int64_t white) {
        const int64_t span = 256 - white - black;
        if (span == 0) return;
        gain = 262144 / span;
        offset = -((gain * black) / 1024) * 256;
    }
    int64_t operator()(int64_t c) const { return (c * gain) / 1024 + offset; }
};

// 1/65535 times (nearly) 2 pi: the curve runs over almost one period across the sample range.
constexpr double kCurveStep = 1.5259021896696422e-05;
constexpr double kCurveTurn = 6.28;

// Levels and the sine curve; d receives each channel's change before it is halved. factor is 60
// for the contrast curve of mode 2 and -60 for the flattening curve of mode 3.
inline void curveChanges(const Levels& lv, int64_t strength, double factor, const int32_t* c, int64_t (&d)[3]) {
    int64_t l[3];
    for (int k = 0; k < 3; ++k) l[k] = lv(c[k]);
    const int64_t m = (l[0] + l[1] + l[2]) / 3;
    for (int k = 0; k < 3; ++k) {
        const int64_t h = (m + l[k]) / 2;
        const double s = std::sin(double(h) * kCurveStep * kCurveTurn);
        // |s * strength * 60| < 2^37: the truncation is defined for every 32-bit strength.
        const int64_t e = int64_t(s * double(strength) * factor);
        d[k] = l[k] - e - c[k];
    }
}

void levelsPass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, const Levels& lv) {
    steps::walkPixels(src, dst, [&lv](const int32_t* c, int32_t* out) {
        int64_t t[3];
        for (int k = 0; k < 3; ++k) t[k] = lv(c[k]) - c[k];
        // Each channel gets the mean of its own change and the mean change: the colour shift halves.
        const int64_t mean = (t[0] + t[1] + t[2]) / 3;
        for (int k = 0; k < 3; ++k) out[k] = clampSample(c[k] + (mean + t[k]) / 2);
    });
}

void curvePass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, const Levels& lv, int64_t strength) {
    steps::walkPixels(src, dst, [&lv, strength](const int32_t* c, int32_t* out) {
        int64_t d[3];
        curveChanges(lv, strength, 60.0, c, d);
        const int64_t mean = (d[0] + d[1] + d[2]) / 3;
        for (int k = 0; k < 3; ++k) out[k] = clampSample(c[k] + (mean + d[k]) / 2);
    });
}

// Black level G at the top row, white level G at the bottom. A rectangle of height 0 gives the rows
// no position to grade by; the levels are then left out like a zero span.
void gradientPass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, KERNEL::cHost* host, int64_t total,
                  int64_t strength) {
    KERNEL::cRect rect{};
    if (host != nullptr) host->GetFilterRect(rect);
    const int64_t height = rect.height();
    Levels lv(0, 0);
    steps::walkPixels(
        src, dst,
        [&](int32_t y) {
            if (height == 0) return;
            const int64_t white = (int64_t(y) * total) / height;
            lv = Levels(total - white, white);
        },
        [&lv, strength](const int32_t* c, int32_t* out) {
            int64_t d[3];
            curveChanges(lv, strength, -60.0, c, d);
            const int64_t mean = (d[0] + d[1] + d[2]) / 3;
            int64_t o[3], sum = 0;
            for (int k = 0; k < 3; ++k) {
                const int64_t u = (mean + d[k]) / 2;
                sum += u;
                o[k] = c[k] + u;
            }
            // Saturation grows with the size of the total change.
            const int64_t gain = (sum < 0 ? -sum : sum) + 45000;
            const int64_t m2 = (o[0] + o[1] + o[2]) / 3;
            for (int k = 0; k < 3; ++k) out[k] = clampSample(m2 + mulSat(o[k] - m2, gain) / 45000);
        });
}

using ToneTable = std::array<int32_t, 1024>;

// A parabola over the sample range peaking at 500 * amount; x and x^2 in single precision, the
// rest in double.
void buildTone(ToneTable& table, int64_t amount) {
    const double a = double(float(amount));
    for (int i = 0; i < 1024; ++i) {
        const float x = float((i - 512.0) / 512.0);
        const float x2 = x * x;
        const double w = 500.0 - 500.0 * double(x2);
        table[size_t(i)] = steps::truncToInt32(w * a);
    }
}

struct GrainSettings {
    int64_t black = 0;       // K
    int64_t whiteCut = 0;    // V
    int64_t amount[3] = {0, 0, 0};
};

void grainPass(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, GrainSettings g) {
    // Black point on the white point leaves no range to stretch; the points are then left out.
    const int64_t span = 65535 - g.whiteCut - g.black;
    int64_t factor = 100;
    if (span == 0)
        g.black = 0;
    else
        factor = 6553500 / span;
    std::array<ToneTable, 3> t;
    for (int k = 0; k < 3; ++k) buildTone(t[size_t(k)], g.amount[k]);
    const int64_t black = g.black;
    steps::walkPixels(src, dst, [&t, black, factor](const int32_t* c, int32_t* out) {
        int64_t p[3];
        // One draw per channel, in channel order; the generator is never seeded here.
        for (int k = 0; k < 3; ++k) p[k] = mulSat(int64_t(c[k]) + std::rand() % 256 - black, factor) / 100;
        for (int k = 0; k < 3; ++k) {
            // Pure black and white skip the curve; p >> 6 <= 1023 inside this range.
            if (p[k] >= 1 && p[k] <= 65534) p[k] += t[size_t(k)][size_t(p[k] >> 6)];
            out[k] = clampSample(p[k]);
        }
    });
}

}  // namespace

void cStep4::Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) {
    if (src == nullptr || dst == nullptr) return;
    switch (mode) {
        case 1:
            levelsPass(src, dst, Levels(blackLevel1 / 2, whiteLevel1 / 2));
            return;
        case 2:
            curvePass(src, dst, Levels(blackLevel2 / 2, whiteLevel2 / 2), curveStrength2);
            return;
        case 3:
            gradientPass(src, dst, Host(), gradientLevel3, curveStrength3);
            return;
        case 4:
        case 5: {
            GrainSettings g;
            g.black = (int64_t(blackPoint5) * 25000) / 100;
            g.whiteCut = ((100 - int64_t(whitePoint5)) * 40000) / 100;
            const int64_t a1 = (int64_t(toneBlue5) - 100 + toneRed5) / 2;
            g.amount[0] = (a1 - 50 + toneRed5) >> 1;
            g.amount[1] = a1;
            g.amount[2] = (a1 - 50 + toneBlue5) >> 1;
            if (mode == 4 && toneSelector4 == 0) {  // lift
                g.black = 0;
                g.whiteCut = (int64_t(liftAmount4) * 5000) / 100;
                g.amount[0] = g.amount[1] = g.amount[2] = (int64_t(liftAmount4) * 32) / 100;
            } else if (mode == 4 && toneSelector4 == 1) {  // darken
                g.black = (int64_t(darkenAmount4) * 5000) / 100;
                g.whiteCut = 0;
                g.amount[0] = (int64_t(darkenAmount4) * -20) / 100;
                g.amount[1] = (int64_t(darkenAmount4) * -24) / 100;
                g.amount[2] = (int64_t(darkenAmount4) * -26) / 100;
            }
            grainPass(src, dst, g);
            return;
        }
        default:
            src->copyTo(dst);
            return;
    }
}
