// Conversions between sample sizes and modes: clamping and shifts per size pair, the RGB/gray family
// paths, the host path, row layouts, and the refusal of modes the kernel does not convert.
#include <random>

#include "BlockTestSupport.h"

using namespace KERNEL;
using blocktest::BlockPtr;
using blocktest::sample;
using blocktest::Wrapped;

namespace {

class ConvertTest : public blocktest::KernelTest {};

uint16_t rgbModeFor(uint32_t bytesPerSample) {
    return bytesPerSample == 1 ? kModeRGB : bytesPerSample == 2 ? kModeRGB16 : kModeRGB32;
}

int64_t read(const cPixelBlock& b, int32_t c, int32_t r, int32_t k) {
    switch (b.bytesPerSample) {
        case 1: return sample<uint8_t>(b, c, r, k);
        case 2: return sample<uint16_t>(b, c, r, k);
        default: return sample<int32_t>(b, c, r, k);
    }
}

void write(cPixelBlock& b, int32_t c, int32_t r, int32_t k, int64_t v) {
    switch (b.bytesPerSample) {
        case 1: sample<uint8_t>(b, c, r, k) = uint8_t(v); break;
        case 2: sample<uint16_t>(b, c, r, k) = uint16_t(v); break;
        default: sample<int32_t>(b, c, r, k) = int32_t(v); break;
    }
}

struct SampleCase {
    uint32_t from, to;  // bytes per sample
    int64_t in, out;
};

TEST_F(ConvertTest, SamplesClampToTheSourceMaximumThenShift) {
    const SampleCase cases[] = {
        {1, 1, 0, 0},           {1, 1, 255, 255},         {1, 2, 255, 32640},     {1, 2, 1, 128},
        {1, 4, 255, 65280},     {1, 4, 1, 256},           {2, 1, 32767, 255},     {2, 1, 32768, 255},
        {2, 1, 127, 0},         {2, 1, 128, 1},           {2, 2, 32768, 32767},   {2, 2, 65535, 32767},
        {2, 2, 5, 5},           {2, 4, 0, 0},             {2, 4, 32767, 65534},   {2, 4, 32768, 65534},
        {4, 1, 65535, 255},     {4, 1, 65536, 255},       {4, 1, -1, 255},        {4, 1, 255, 0},
        {4, 2, 65535, 32767},   {4, 2, 65536, 32767},     {4, 2, -70000, 32767},  {4, 2, 3, 1},
        {4, 4, 70000, 65535},   {4, 4, -5, 65535},        {4, 4, 1234, 1234},
    };
    for (const auto& t : cases) {
        SCOPED_TRACE(testing::Message() << t.from << " -> " << t.to << " bytes, in " << t.in);
        Wrapped src(rgbModeFor(t.from), t.from, 3 * t.from, 1, 1);
        Wrapped dst(rgbModeFor(t.to), t.to, 3 * t.to, 1, 1);
        for (int k = 0; k < 3; ++k) write(*src.block, 0, 0, k, t.in);
        if (t.from == t.to) src->mode = dst->mode;  // same size, different mode is not a case here
        src->convertTo(dst.get());
        for (int k = 0; k < 3; ++k) EXPECT_EQ(read(*dst.block, 0, 0, k), t.out) << "channel " << k;
    }
}

TEST_F(ConvertTest, GrayAndRGBFamiliesConvertWithoutTheHost) {
    // RGB -> gray takes channel 0; gray -> RGB writes the gray sample to all three channels.
    Wrapped rgb16(kModeRGB16, 2, 6, 2, 1);
    write(*rgb16.block, 0, 0, 0, 32768);
    write(*rgb16.block, 0, 0, 1, 100);
    write(*rgb16.block, 1, 0, 0, 256);
    Wrapped gray(kModeGray, 1, 1, 2, 1);
    rgb16->convertTo(gray.get());
    EXPECT_EQ(gray.memory[0], 255);
    EXPECT_EQ(gray.memory[1], 2);

    Wrapped gray16(kModeGray16, 2, 2, 2, 1);
    write(*gray16.block, 0, 0, 0, 1000);
    write(*gray16.block, 1, 0, 0, 32768);
    Wrapped working(kModeRGB32, 4, 12, 2, 1);
    gray16->convertTo(working.get());
    for (int k = 0; k < 3; ++k) {
        EXPECT_EQ(read(*working.block, 0, 0, k), 2000);
        EXPECT_EQ(read(*working.block, 1, 0, k), 65534);
    }
    EXPECT_EQ(host.conversion.calls, 0);
}

TEST_F(ConvertTest, PackedAndPaddedLayoutsGiveTheSameSamples) {
    // The packed path runs over whole rows; host layouts carry an extra plane and row padding.
    std::mt19937 random(7);
    for (int width : {1, 2, 7, 8, 9, 33}) {
        SCOPED_TRACE(width);
        const int height = 3;
        Wrapped packed(kModeRGB, 1, 3, width, height);
        Wrapped padded(kModeRGB, 1, 4, width, height, width * 4 + 5);
        for (int r = 0; r < height; ++r)
            for (int c = 0; c < width; ++c)
                for (int k = 0; k < 3; ++k) {
                    const uint8_t v = uint8_t(random());
                    sample<uint8_t>(*packed, c, r, k) = v;
                    sample<uint8_t>(*padded, c, r, k) = v;
                }
        Wrapped fromPacked(kModeRGB32, 4, 12, width, height);
        Wrapped fromPadded(kModeRGB32, 4, 16, width, height, width * 16 + 8, 0, 0, 1, 0xEE);
        packed->convertTo(fromPacked.get());
        padded->convertTo(fromPadded.get());
        for (int r = 0; r < height; ++r)
            for (int c = 0; c < width; ++c) {
                for (int k = 0; k < 3; ++k) {
                    const int32_t expected = int32_t(sample<uint8_t>(*packed, c, r, k)) << 8;
                    ASSERT_EQ(sample<int32_t>(*fromPacked, c, r, k), expected) << c << "," << r;
                    ASSERT_EQ(sample<int32_t>(*fromPadded, c, r, k), expected) << c << "," << r;
                }
                ASSERT_EQ(uint32_t(sample<int32_t>(*fromPadded, c, r, 3)), 0xEEEEEEEEu) << "extra plane written";
            }
        for (int r = 0; r < height; ++r)
            for (int pad = width * 16; pad < width * 16 + 8; ++pad)
                ASSERT_EQ(fromPadded.memory[size_t(r) * (width * 16 + 8) + pad], 0xEE) << "row padding written";

        // And back: 16-bit via the working block round-trips exactly for values of 8 bits.
        Wrapped back(kModeRGB, 1, 3, width, height);
        fromPadded->convertTo(back.get());
        EXPECT_EQ(back.memory, packed.memory);
    }
}

TEST_F(ConvertTest, SmallerDestinationBoundsTheWalk) {
    Wrapped src(kModeRGB, 1, 3, 4, 4, 0, 0, 0, 1, 9);
    std::vector<uint8_t> memory(3 * 3 * 12 + 64, 0xEE);
    BlockPtr dst(cPixelBlock::create(memory.data(), 3, 3, 4, 12, 0, 1, kModeRGB32, 36, 0, 0));
    src->convertTo(dst.get());
    EXPECT_EQ(sample<int32_t>(*dst, 2, 2, 2), 9 << 8);
    for (size_t i = 3 * 3 * 12; i < memory.size(); ++i) ASSERT_EQ(memory[i], 0xEE) << "wrote past the block";
}

TEST_F(ConvertTest, OtherModePairsGoThroughTheHostOnePixelAtATime) {
    host.conversion.convert = [](int32_t, int32_t, int16_t* c) {
        // Stand-in for the host: a naive RGB -> CMYK.
        const int16_t r = c[0], g = c[1], b = c[2];
        c[0] = int16_t(255 - r);
        c[1] = int16_t(255 - g);
        c[2] = int16_t(255 - b);
        c[3] = int16_t(c[3] == 0 ? 17 : 99);  // the fourth input component arrives cleared
    };
    // 16-bit RGB in, 8-bit CMYK out; 32768 is clamped to 255 before it reaches the host.
    Wrapped src(kModeRGB16, 2, 6, 3, 1);
    const int64_t in[3][3] = {{0, 128, 256}, {32768, 32767, 16384}, {1000, 2000, 3000}};
    for (int c = 0; c < 3; ++c)
        for (int k = 0; k < 3; ++k) write(*src.block, c, 0, k, in[c][k]);
    Wrapped cmyk(kModeCMYK, 1, 4, 3, 1);
    src->convertTo(cmyk.get());
    EXPECT_EQ(host.conversion.calls, 3);
    EXPECT_EQ(host.conversion.sourceMode, kModeRGB16);
    EXPECT_EQ(host.conversion.resultMode, kModeCMYK);
    for (int c = 0; c < 3; ++c) {
        for (int k = 0; k < 3; ++k)
            EXPECT_EQ(read(*cmyk.block, c, 0, k), 255 - std::min<int64_t>(in[c][k], 32767) / 128) << c << "," << k;
        EXPECT_EQ(read(*cmyk.block, c, 0, 3), 17);
    }

    // 8-bit CMYK into 16-bit Lab: the low byte of each component, shifted left by 7.
    host.conversion.convert = [](int32_t, int32_t, int16_t* c) {
        c[0] = int16_t(0x1FF);  // only the low byte counts
        c[1] = 1;
        c[2] = 200;
    };
    Wrapped lab16(kModeLab16, 2, 6, 3, 1);
    cmyk->convertTo(lab16.get());
    EXPECT_EQ(host.conversion.calls, 6);
    EXPECT_EQ(read(*lab16.block, 1, 0, 0), 255 << 7);
    EXPECT_EQ(read(*lab16.block, 1, 0, 1), 1 << 7);
    EXPECT_EQ(read(*lab16.block, 1, 0, 2), 200 << 7);
}

TEST_F(ConvertTest, ModesWithoutSampleSizeAreRefusedUntouched) {
    // Modes 2, 5-8 and 14-16 have no bytes per sample; nor has an unknown mode number.
    const uint16_t unconvertible[] = {2, 5, 6, 7, 8, 14, 15, 16, 40};
    Wrapped rgb(kModeRGB, 1, 3, 2, 2, 0, 0, 0, 1, 0x33);
    for (uint16_t m : unconvertible) {
        SCOPED_TRACE(m);
        Wrapped other(m, 1, 3, 2, 2, 0, 0, 0, 1, 0xEE);
        rgb->convertTo(other.get());
        for (uint8_t byte : other.memory) ASSERT_EQ(byte, 0xEE);
        other->convertTo(rgb.get());
        for (uint8_t byte : rgb.memory) ASSERT_EQ(byte, 0x33);
        rgb->copyTo(other.get());  // copyTo delegates to convertTo for different modes
        for (uint8_t byte : other.memory) ASSERT_EQ(byte, 0xEE);

        // convertedTo still hands back a block of the requested mode, blank rather than unwritten.
        BlockPtr converted(rgb->convertedTo(m));
        EXPECT_EQ(converted->mode, m);
        converted->lock();
        const size_t bytes = size_t(converted->storedRows()) * converted->rowBytes;
        for (size_t i = 0; i < bytes; ++i) ASSERT_EQ(converted->data[i], 0);
    }
    // Sample sizes other than 1, 2 and 4 are refused too.
    Wrapped odd(kModeRGB16, 3, 9, 2, 2, 0, 0, 0, 1, 0xEE);
    rgb->convertTo(odd.get());
    for (uint8_t byte : odd.memory) ASSERT_EQ(byte, 0xEE);
    EXPECT_EQ(host.conversion.calls, 0);
}

TEST_F(ConvertTest, UnlockedBlocksAreNeitherReadNorWritten) {
    Wrapped rgb(kModeRGB, 1, 3, 2, 2, 0, 0, 0, 1, 0x33);
    BlockPtr empty(rgb->createEmpty(kModeRGB32));
    ASSERT_EQ(empty->data, nullptr);
    rgb->convertTo(empty.get());  // must not write through a null address
    empty->convertTo(rgb.get());
    rgb->copyTo(empty.get());
    for (uint8_t byte : rgb.memory) EXPECT_EQ(byte, 0x33);
}

}  // namespace
