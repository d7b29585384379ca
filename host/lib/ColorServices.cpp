// Textbook conversions, all through RGB in 0..1 (doubles), rounded to the nearest integer at the end:
//   RGB   components 0..255.
//   HSB   hue 0..359 degrees, saturation and brightness 0..255 (= 0..100 %):
//         B = max, S = (max - min) / max, hue from the largest component (hexcone model).
//   HSL   hue as HSB, L = (max + min) / 2, S = (max - min) / (1 - |2L - 1|).
//   CMYK  0..255, 0 = no ink: K = 1 - max, C = (1 - R - K) / (1 - K) (M, Y alike).
//   Gray  Rec. 601 luma: 0.299 R + 0.587 G + 0.114 B.
//   Lab   CIE L*a*b* over sRGB with the D65 white; L = L* x 255 / 100, a = a* + 128, b = b* + 128,
//         each clamped to 0..255. Out-of-gamut results are clipped to the RGB cube.
#include "noctiva/host/ColorServices.h"

#include <algorithm>
#include <cmath>

namespace noctiva::host {

namespace {

struct Rgb {
    double r, g, b;
};

double clamp01(double v) { return std::clamp(v, 0.0, 1.0); }
double unit(pi::int16 c) { return std::clamp(int(c), 0, 255) / 255.0; }
pi::int16 byte(double v) { return pi::int16(std::lround(clamp01(v) * 255.0)); }
pi::int16 degrees(double h) {
    long d = std::lround(h);
    return pi::int16(((d % 360) + 360) % 360);
}
double hueOf(pi::int16 c) { return double(((int(c) % 360) + 360) % 360); }

// Hue in degrees of an RGB colour with the given extremes (0 for grays).
double hueFrom(const Rgb& c, double max, double min) {
    const double d = max - min;
    if (d <= 0) return 0;
    double h;
    if (max == c.r)
        h = std::fmod((c.g - c.b) / d, 6.0);
    else if (max == c.g)
        h = (c.b - c.r) / d + 2.0;
    else
        h = (c.r - c.g) / d + 4.0;
    h *= 60.0;
    return h < 0 ? h + 360.0 : h;
}

// RGB from hue, chroma and the amount added to every component.
Rgb fromHueChroma(double hue, double chroma, double m) {
    const double hp = hue / 60.0;
    const double x = chroma * (1 - std::fabs(std::fmod(hp, 2.0) - 1));
    Rgb c{0, 0, 0};
    switch (int(hp) % 6) {
        case 0: c = {chroma, x, 0}; break;
        case 1: c = {x, chroma, 0}; break;
        case 2: c = {0, chroma, x}; break;
        case 3: c = {0, x, chroma}; break;
        case 4: c = {x, 0, chroma}; break;
        default: c = {chroma, 0, x}; break;
    }
    return {clamp01(c.r + m), clamp01(c.g + m), clamp01(c.b + m)};
}

constexpr double kWhiteX = 0.95047, kWhiteY = 1.0, kWhiteZ = 1.08883;

double srgbToLinear(double v) { return v <= 0.04045 ? v / 12.92 : std::pow((v + 0.055) / 1.055, 2.4); }
double linearToSrgb(double v) { return v <= 0.0031308 ? v * 12.92 : 1.055 * std::pow(v, 1 / 2.4) - 0.055; }
double labF(double t) { return t > 216.0 / 24389.0 ? std::cbrt(t) : (24389.0 / 27.0 * t + 16.0) / 116.0; }
double labFInverse(double f) {
    const double t = f * f * f;
    return t > 216.0 / 24389.0 ? t : (116.0 * f - 16.0) / (24389.0 / 27.0);
}

bool toRgb(pi::int16 space, const pi::int16 c[4], Rgb& out) {
    switch (space) {
        case pi::plugIncolorServicesRGBSpace: out = {unit(c[0]), unit(c[1]), unit(c[2])}; return true;
        case pi::plugIncolorServicesGraySpace: out = {unit(c[0]), unit(c[0]), unit(c[0])}; return true;
        case pi::plugIncolorServicesHSBSpace: {
            const double v = unit(c[2]), chroma = v * unit(c[1]);
            out = fromHueChroma(hueOf(c[0]), chroma, v - chroma);
            return true;
        }
        case pi::plugIncolorServicesHSLSpace: {
            const double l = unit(c[2]), chroma = (1 - std::fabs(2 * l - 1)) * unit(c[1]);
            out = fromHueChroma(hueOf(c[0]), chroma, l - chroma / 2);
            return true;
        }
        case pi::plugIncolorServicesCMYKSpace: {
            const double k = unit(c[3]);
            out = {(1 - unit(c[0])) * (1 - k), (1 - unit(c[1])) * (1 - k), (1 - unit(c[2])) * (1 - k)};
            return true;
        }
        case pi::plugIncolorServicesLabSpace: {
            const double L = unit(c[0]) * 100.0, a = std::clamp(int(c[1]), 0, 255) - 128.0,
                         b = std::clamp(int(c[2]), 0, 255) - 128.0;
            const double fy = (L + 16) / 116, fx = fy + a / 500, fz = fy - b / 200;
            const double x = kWhiteX * labFInverse(fx), y = kWhiteY * labFInverse(fy), z = kWhiteZ * labFInverse(fz);
            const double rl = 3.2404542 * x - 1.5371385 * y - 0.4985314 * z;
            const double gl = -0.9692660 * x + 1.8760108 * y + 0.0415560 * z;
            const double bl = 0.0556434 * x - 0.2040259 * y + 1.0572252 * z;
            out = {clamp01(linearToSrgb(clamp01(rl))), clamp01(linearToSrgb(clamp01(gl))),
                   clamp01(linearToSrgb(clamp01(bl)))};
            return true;
        }
        default: return false;
    }
}

bool fromRgb(pi::int16 space, const Rgb& c, pi::int16 out[4]) {
    const double max = std::max({c.r, c.g, c.b}), min = std::min({c.r, c.g, c.b});
    switch (space) {
        case pi::plugIncolorServicesRGBSpace:
            out[0] = byte(c.r), out[1] = byte(c.g), out[2] = byte(c.b), out[3] = 0;
            return true;
        case pi::plugIncolorServicesGraySpace:
            out[0] = byte(0.299 * c.r + 0.587 * c.g + 0.114 * c.b), out[1] = out[2] = out[3] = 0;
            return true;
        case pi::plugIncolorServicesHSBSpace:
            out[0] = degrees(hueFrom(c, max, min));
            out[1] = byte(max > 0 ? (max - min) / max : 0);
            out[2] = byte(max), out[3] = 0;
            return true;
        case pi::plugIncolorServicesHSLSpace: {
            const double l = (max + min) / 2, d = max - min;
            const double denominator = 1 - std::fabs(2 * l - 1);
            out[0] = degrees(hueFrom(c, max, min));
            out[1] = byte(denominator > 0 ? d / denominator : 0);
            out[2] = byte(l), out[3] = 0;
            return true;
        }
        case pi::plugIncolorServicesCMYKSpace: {
            const double k = 1 - max;
            const double rest = 1 - k;
            out[0] = byte(rest > 0 ? (1 - c.r - k) / rest : 0);
            out[1] = byte(rest > 0 ? (1 - c.g - k) / rest : 0);
            out[2] = byte(rest > 0 ? (1 - c.b - k) / rest : 0);
            out[3] = byte(k);
            return true;
        }
        case pi::plugIncolorServicesLabSpace: {
            const double rl = srgbToLinear(c.r), gl = srgbToLinear(c.g), bl = srgbToLinear(c.b);
            const double x = 0.4124564 * rl + 0.3575761 * gl + 0.1804375 * bl;
            const double y = 0.2126729 * rl + 0.7151522 * gl + 0.0721750 * bl;
            const double z = 0.0193339 * rl + 0.1191920 * gl + 0.9503041 * bl;
            const double fx = labF(x / kWhiteX), fy = labF(y / kWhiteY), fz = labF(z / kWhiteZ);
            const double L = 116 * fy - 16, a = 500 * (fx - fy), b = 200 * (fy - fz);
            out[0] = byte(L / 100.0);
            out[1] = pi::int16(std::clamp(std::lround(a + 128), 0L, 255L));
            out[2] = pi::int16(std::clamp(std::lround(b + 128), 0L, 255L));
            out[3] = 0;
            return true;
        }
        default: return false;
    }
}

}  // namespace

pi::OSErr convertColor(pi::int16 sourceSpace, pi::int16 resultSpace, pi::int16 components[4]) {
    if (!components) return pi::paramErr;
    if (sourceSpace == resultSpace &&
        (sourceSpace >= pi::plugIncolorServicesRGBSpace && sourceSpace <= pi::plugIncolorServicesHSLSpace))
        return pi::noErr;
    Rgb rgb{};
    pi::int16 result[4] = {0, 0, 0, 0};
    if (!toRgb(sourceSpace, components, rgb) || !fromRgb(resultSpace, rgb, result)) return pi::paramErr;
    std::copy(result, result + 4, components);
    return pi::noErr;
}

}  // namespace noctiva::host
