// A whole filter run through our host: a small random image (up to 64 x 64, 8 or 16 bits, RGB or
// RGBA), a random filter rectangle and a value for each of the 58 parameters, biased towards each
// step's mode numbers, typical ranges and the extremes. Every run must end cleanly: no error, no
// leak, the settings recorded, and nothing outside the rectangle or in alpha changed.
#include <fuzzer/FuzzedDataProvider.h>

#include <array>
#include <climits>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <string>

#include "noctiva/host/Session.h"
#include "steps/ParameterTable.h"

extern "C" void ENTRYPOINT(pi::int16 selector, pi::FilterRecord* filterRecord, intptr_t* data, pi::int16* result);

namespace {

using noctiva::host::Image;
using noctiva::host::RunOptions;
using noctiva::host::RunResult;
using noctiva::host::Selection;

constexpr std::size_t kMaxInput = 4096;
constexpr int kMaxSide = 64;

// Text positions of the four step modes and the values their switches know.
constexpr int kStep4Mode = 14, kStep3Mode = 33, kStep2Mode = 50, kStep1Mode = 57;
constexpr std::array<int32_t, 6> kStep1Modes{0, 1, 2, 3, 4, 105};
constexpr std::array<int32_t, 19> kStep2Modes{0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 100, 101, 102, 103, 104, 105, 106, 107, 108};
constexpr std::array<int32_t, 6> kStep34Modes{0, 1, 2, 3, 4, 5};
constexpr std::array<int32_t, 14> kExtremes{INT32_MIN, INT32_MIN + 1, -65536, -256, -1, 0,      1,
                                            255,       256,           32768,  65535, 65536, INT32_MAX - 1, INT32_MAX};

template <std::size_t N>
int32_t pick(FuzzedDataProvider& in, const std::array<int32_t, N>& values) {
    return values[in.ConsumeIntegralInRange<std::size_t>(0, N - 1)];
}

int32_t modeValue(FuzzedDataProvider& in, int position) {
    if (in.ConsumeIntegralInRange(0, 7) == 0) return in.ConsumeIntegral<int32_t>();  // unknown modes too
    switch (position) {
        case kStep1Mode: return pick(in, kStep1Modes);
        case kStep2Mode: return pick(in, kStep2Modes);
        default: return pick(in, kStep34Modes);
    }
}

int32_t parameterValue(FuzzedDataProvider& in, const cParameterInfo& info) {
    switch (in.ConsumeIntegralInRange(0, 5)) {
        case 0: return info.defaultValue;
        case 1: return in.ConsumeIntegralInRange(-2, 300);  // the typical ranges: percent, levels, radii
        case 2: return info.defaultValue + in.ConsumeIntegralInRange(-20, 20);
        case 3: return pick(in, kExtremes);
        case 4: return in.ConsumeIntegralInRange(-100000, 100000);
        default: return in.ConsumeIntegral<int32_t>();
    }
}

void fillImage(FuzzedDataProvider& in, Image& image) {
    const int maxValue = image.maxValue();
    std::mt19937 random(in.ConsumeIntegral<uint32_t>());
    switch (in.ConsumeIntegralInRange(0, 3)) {
        case 0:  // noise over the whole range
            for (size_t i = 0; i < image.sampleCount(); ++i) image.setSample(i, uint16_t(random() % unsigned(maxValue + 1)));
            break;
        case 1: {  // flat: zero spans and uniform windows
            const uint16_t v = in.ConsumeIntegralInRange<uint16_t>(0, uint16_t(maxValue));
            for (size_t i = 0; i < image.sampleCount(); ++i) image.setSample(i, v);
            break;
        }
        case 2:  // a gradient with a little noise
            for (int y = 0; y < image.height; ++y)
                for (int x = 0; x < image.width; ++x)
                    for (int c = 0; c < image.channels; ++c)
                        image.set(x, y, c,
                                  uint16_t(((x + y * 3 + c * 17) * maxValue / (image.width + image.height * 3 + 51) +
                                            random() % 3) %
                                           (maxValue + 1)));
            break;
        default:  // black and white extremes
            for (size_t i = 0; i < image.sampleCount(); ++i) image.setSample(i, (random() & 1) ? uint16_t(maxValue) : 0);
            break;
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size > kMaxInput) return 0;
    FuzzedDataProvider in(data, size);

    const int width = in.ConsumeIntegralInRange(1, kMaxSide);
    const int height = in.ConsumeIntegralInRange(1, kMaxSide);
    const int channels = in.ConsumeBool() ? 4 : 3;
    const int depth = in.ConsumeBool() ? 16 : 8;
    RunOptions options;
    options.failOnLeak = true;
    options.parentWindow = false;  // no display work in the loop
    options.relocateHandles = in.ConsumeBool();
    Selection s{0, 0, width, height};
    if (in.ConsumeBool()) {
        s.x = in.ConsumeIntegralInRange(0, width - 1);
        s.y = in.ConsumeIntegralInRange(0, height - 1);
        s.width = in.ConsumeIntegralInRange(1, width - s.x);
        s.height = in.ConsumeIntegralInRange(1, height - s.y);
        options.selection = s;
    }

    std::string text = "vek ";
    for (const cParameterInfo& info : shadowParameterTable()) {
        const bool isMode =
            info.number == kStep1Mode || info.number == kStep2Mode || info.number == kStep3Mode || info.number == kStep4Mode;
        const int32_t value = isMode ? modeValue(in, info.number) : parameterValue(in, info);
        text += " Parameter" + std::to_string(info.number) + " " + std::to_string(value) + " ";
    }
    options.par1 = text;

    Image image(width, height, channels, depth);
    fillImage(in, image);
    static const bool show = std::getenv("NOCTIVA_FUZZ_SHOW") != nullptr;  // to replay a found input
    if (show)
        std::fprintf(stderr, "image %dx%d, %d channels, %d bits, rectangle %d,%d %dx%d\n%s\n", width, height,
                     channels, depth, s.x, s.y, s.width, s.height, text.c_str());
    const Image before = image;

    const RunResult result = noctiva::host::runFilter(&ENTRYPOINT, image, options);
    if (!result.ok() || result.leaks.any() || result.par1Out.rfind("vek ", 0) != 0) {
        std::fprintf(stderr, "run failed: %s\nsettings: %s\n", result.message().c_str(), text.c_str());
        std::abort();
    }
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) {
            const bool inside = x >= s.x && x < s.x + s.width && y >= s.y && y < s.y + s.height;
            for (int c = 0; c < channels; ++c)
                if ((!inside || c == 3) && image.at(x, y, c) != before.at(x, y, c)) {
                    std::fprintf(stderr, "sample %d,%d plane %d outside the filter's reach changed\n", x, y, c);
                    std::abort();
                }
        }
    return 0;
}
