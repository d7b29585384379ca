// Pixel blocks: the cursor, geometry, storage lifecycle, copies and failure cleanup.
#include "BlockTestSupport.h"

using namespace KERNEL;
using blocktest::BlockPtr;
using blocktest::sample;
using blocktest::Wrapped;

namespace {

class PixelBlockTest : public blocktest::KernelTest {};

// ---------------------------------------------------------------------------------------------------
// Cursor

struct CursorCase {
    int32_t x, y;
    uint32_t column, row, columnsLeft, rowsLeft;
    uint32_t clampLeft, clampRight, clampTop, clampBottom;
};

TEST_F(PixelBlockTest, CursorClampsOnAllFourSides) {
    // 4 x 3 stored pixels at image position (2, 5).
    Wrapped b(kModeRGB, 1, 3, 4, 3, 0, 2, 5);
    const CursorCase cases[] = {
        {2, 5, 0, 0, 4, 3, 0, 0, 0, 0},   // first pixel
        {5, 7, 3, 2, 1, 1, 0, 0, 0, 0},   // last pixel
        {-1, 6, 0, 1, 4, 2, 3, 0, 0, 0},  // left
        {6, 6, 3, 1, 1, 2, 0, 1, 0, 0},   // right, one past
        {9, 6, 3, 1, 1, 2, 0, 4, 0, 0},   // right, further
        {3, 3, 1, 0, 3, 3, 0, 0, 2, 0},   // above
        {3, 8, 1, 2, 3, 1, 0, 0, 0, 1},   // below, one past
        {0, 10, 0, 2, 4, 1, 2, 0, 0, 3},  // below left corner
    };
    for (const auto& t : cases) {
        SCOPED_TRACE(testing::Message() << "x=" << t.x << " y=" << t.y);
        cPixel c;
        b->getPixel(c, t.x, t.y);
        EXPECT_EQ(c.column, t.column);
        EXPECT_EQ(c.row, t.row);
        EXPECT_EQ(c.columnsLeft, t.columnsLeft);
        EXPECT_EQ(c.rowsLeft, t.rowsLeft);
        EXPECT_EQ(c.clampLeft, t.clampLeft);
        EXPECT_EQ(c.clampRight, t.clampRight);
        EXPECT_EQ(c.clampTop, t.clampTop);
        EXPECT_EQ(c.clampBottom, t.clampBottom);
        EXPECT_EQ(c.channel[2], b->data + t.row * b->rowBytes + t.column * 3 + 2);
    }
}

TEST_F(PixelBlockTest, CursorRepeatsEdgePixelsWhenMoving) {
    Wrapped b(kModeRGB32, 4, 12, 4, 4);
    uint8_t* first = b->data;

    cPixel c;
    b->getPixel(c, -3, 0);
    for (int i = 0; i < 3; ++i) {
        c.right();
        EXPECT_EQ(c.channel[0], first) << "move " << i + 1 << " must stay on the first column";
    }
    c.right();
    EXPECT_EQ(c.channel[0], first + 12);
    EXPECT_EQ(c.channel[2], first + 12 + 8);
    EXPECT_EQ(c.column, 1u);

    b->getPixel(c, 4, 0);  // one past the right edge
    EXPECT_EQ(c.clampRight, 1u);
    EXPECT_EQ(c.columnsLeft, 1u);
    uint8_t* last = c.channel[0];
    c.right();
    c.right();
    EXPECT_EQ(c.channel[0], last);

    b->getPixel(c, 0, -2);
    c.down();
    c.down();
    EXPECT_EQ(c.channel[0], first);
    c.down();
    EXPECT_EQ(c.channel[0], first + b->rowBytes);
    c.down();
    c.down();
    EXPECT_EQ(c.row, 3u);
    c.down();
    EXPECT_EQ(c.row, 3u) << "the last row repeats";
}

TEST_F(PixelBlockTest, CursorWithSamplingTwoRoundsToNearestStoredPixel) {
    // 10 x 10 image pixels stored as 5 x 5.
    Wrapped b(kModeRGB, 1, 3, 10, 10, 0, 0, 0, 2);
    const struct {
        int32_t x;
        uint32_t column, clampRight;
    } cases[] = {{0, 0, 0}, {1, 1, 0}, {2, 1, 0}, {3, 2, 0}, {8, 4, 0}, {9, 4, 1}};
    for (const auto& t : cases) {
        cPixel c;
        b->getPixel(c, t.x, 0);
        EXPECT_EQ(c.column, t.column) << "x=" << t.x;
        EXPECT_EQ(c.clampRight, t.clampRight) << "x=" << t.x;
        EXPECT_EQ(c.channel[0], b->data + t.column * 3) << "x=" << t.x;
    }
}

TEST_F(PixelBlockTest, CursorOnBlockWithoutPixelsIsZeroed) {
    Wrapped noRows(kModeRGB, 1, 3, 4, 0);
    Wrapped noColumns(kModeRGB, 1, 3, 0, 4);
    cPixelBlock empty;
    for (cPixelBlock* b : {noRows.get(), noColumns.get(), &empty}) {
        cPixel c;
        c.column = 99;
        b->getPixel(c, 5, 5);
        EXPECT_EQ(c.channel[0], nullptr);
        EXPECT_EQ(c.column, 0u);
        EXPECT_EQ(c.columnsLeft, 0u);
        EXPECT_EQ(c.rowsLeft, 0u);
    }
}

// ---------------------------------------------------------------------------------------------------
// Factories and geometry

TEST_F(PixelBlockTest, CreatePicksTheClassForTheModeAndFixesItsSampleSize) {
    uint8_t memory[64] = {};
    const struct {
        uint16_t mode;
        uint32_t expectedBytesPerSample;
        bool (*isClass)(cPixelBlock*);
    } cases[] = {
        {kModeGray, 1, [](cPixelBlock* b) { return dynamic_cast<cGRAYSCALEPixelBlock*>(b) != nullptr; }},
        {kModeRGB, 1, [](cPixelBlock* b) { return dynamic_cast<cRGBPixelBlock*>(b) != nullptr; }},
        {kModeCMYK, 1, [](cPixelBlock* b) { return dynamic_cast<cCMYKPixelBlock*>(b) != nullptr; }},
        {kModeLab, 1, [](cPixelBlock* b) { return dynamic_cast<cLABPixelBlock*>(b) != nullptr; }},
        {kModeRGB32, 4, [](cPixelBlock* b) { return dynamic_cast<cRGB32PixelBlock*>(b) != nullptr; }},
        {kModeRGB16, 2, [](cPixelBlock* b) { return typeid(*b) == typeid(cPixelBlock); }},
    };
    for (const auto& t : cases) {
        BlockPtr b(cPixelBlock::create(memory, 2, 2, 2, 6, 0, 1, t.mode, 12, 3, 4));
        EXPECT_TRUE(t.isClass(b.get())) << "mode " << t.mode;
        EXPECT_EQ(b->bytesPerSample, t.expectedBytesPerSample) << "mode " << t.mode;
        BlockPtr view(b->createView());
        EXPECT_EQ(typeid(*view), typeid(*b));
        EXPECT_EQ(view->data, b->data);
    }
}

struct SubBlockCase {
    int32_t parentX, parentY, sampling;
    int32_t x, y, width, height;
    int32_t expectedWidth, expectedHeight;
    size_t expectedOffsetPixels, expectedOffsetRows;  // in stored pixels / rows
};

TEST_F(PixelBlockTest, SubBlockClipsToTheParent) {
    const SubBlockCase cases[] = {
        {0, 0, 1, 8, 8, 5, 5, 2, 2, 8, 8},     // overhangs right and bottom
        {0, 0, 1, -3, 2, 5, 4, 2, 4, 0, 2},    // starts left of the block
        {0, 0, 1, 2, -1, 3, 20, 3, 10, 2, 0},  // taller than the block
        {0, 0, 1, 12, 0, 3, 3, 0, 3, 10, 0},   // entirely to the right
        {0, 0, 1, -9, 0, 3, 3, 0, 3, 0, 0},    // entirely to the left
        {5, 5, 1, 6, 7, 3, 3, 3, 3, 1, 2},     // parent not at the origin
        {0, 0, 2, 4, 2, 4, 4, 4, 4, 2, 1},     // sampled parent: offsets in stored pixels
    };
    for (const auto& t : cases) {
        SCOPED_TRACE(testing::Message() << "at (" << t.x << ", " << t.y << ") size " << t.width << " x " << t.height);
        Wrapped parent(kModeRGB, 1, 3, 10, 10, 0, t.parentX, t.parentY, t.sampling);
        BlockPtr sub(parent->subBlock(t.x, t.y, t.width, t.height));
        EXPECT_EQ(sub->outerRect, (cRect{0, int16_t(t.expectedWidth), 0, int16_t(t.expectedHeight)}));
        EXPECT_EQ(sub->innerRect, sub->outerRect);
        EXPECT_EQ(sub->data, parent->data + t.expectedOffsetPixels * 3 + t.expectedOffsetRows * parent->rowBytes);
        EXPECT_EQ(sub->sampling, t.sampling);
    }
}

// ---------------------------------------------------------------------------------------------------
// Storage lifecycle

TEST_F(PixelBlockTest, StorageIsRowsTimesRowBytesPlusSlackAndReturnedUnlocked) {
    const struct {
        uint16_t mode;
        int32_t width, height;
        uint32_t expectedSize;
    } cases[] = {
        {kModeRGB, 5, 3, 46},        // T = 45 -> + 1
        {kModeRGB, 2, 1, 8},         // T = 6 -> + 2
        {kModeRGB, 1, 1, 6},         // T = 3 -> + 3
        {kModeRGB32, 3, 1, 36},      // T = 36 -> + 0
        {kModeGray, 0, 4, 0},        // no columns
    };
    for (const auto& t : cases) {
        Wrapped src(t.mode, uint32_t(modeBytesPerSample[t.mode]), uint32_t(modeBytesPerPixel[t.mode]), t.width,
                    t.height);
        BlockPtr empty(src->createEmpty());
        ASSERT_NE(empty->memory, nullptr);
        EXPECT_EQ(empty->memory->Size(), t.expectedSize) << "mode " << t.mode << " " << t.width << "x" << t.height;
        EXPECT_EQ(empty->data, nullptr) << "createEmpty must return the block unlocked";
        EXPECT_FALSE(empty->memory->IsLocked());
        empty->lock();
        EXPECT_TRUE(empty->memory->IsLocked());
        if (t.expectedSize != 0) {
            EXPECT_NE(empty->data, nullptr);
        }
        uint8_t* first = empty->data;
        empty->lock();  // a second lock keeps the address
        EXPECT_EQ(empty->data, first);
    }
}

TEST_F(PixelBlockTest, CloneAndConvertedToOwnACopyAndKeepGeometry) {
    Wrapped src(kModeRGB, 1, 3, 4, 3, 0, 10, 20);
    src->innerRect = {11, 13, 21, 22};
    for (size_t i = 0; i < src.memory.size(); ++i) src.memory[i] = uint8_t(i * 7 + 1);

    BlockPtr copy(src->clone());
    EXPECT_NE(dynamic_cast<cRGBPixelBlock*>(copy.get()), nullptr);
    EXPECT_EQ(copy->data, nullptr);
    copy->lock();
    EXPECT_EQ(copy->outerRect, src->outerRect);
    EXPECT_EQ(copy->innerRect, src->innerRect);
    EXPECT_EQ(0, std::memcmp(copy->data, src.memory.data(), src.memory.size()));

    BlockPtr working(src->convertedTo(kModeRGB32));
    ASSERT_NE(dynamic_cast<cRGB32PixelBlock*>(working.get()), nullptr);
    EXPECT_EQ(working->mode, kModeRGB32);
    EXPECT_EQ(working->bytesPerSample, 4u);
    EXPECT_EQ(working->bytesPerPixel, 12u);
    EXPECT_EQ(working->rowBytes, 48u);
    EXPECT_EQ(working->innerRect, src->innerRect);
    working->lock();
    EXPECT_EQ(sample<int32_t>(*working, 3, 2, 1), int32_t(sample<uint8_t>(*src, 3, 2, 1)) << 8);

    // Copy constructors: same mode and converting.
    cRGBPixelBlock direct(src.get());
    direct.lock();
    EXPECT_EQ(0, std::memcmp(direct.data, src.memory.data(), src.memory.size()));
    cRGB32PixelBlock converting(kModeRGB32, src.get());
    converting.lock();
    EXPECT_EQ(sample<int32_t>(converting, 1, 1, 2), int32_t(sample<uint8_t>(*src, 1, 1, 2)) << 8);
}

TEST_F(PixelBlockTest, ViewsAndSubBlocksDoNotFreeTheParentsStorage) {
    Wrapped src(kModeRGB, 1, 3, 6, 6);
    for (size_t i = 0; i < src.memory.size(); ++i) src.memory[i] = uint8_t(i);
    BlockPtr owner(src->clone());
    owner->lock();
    const size_t buffers = host.liveBuffers();
    ASSERT_EQ(buffers, 1u);
    {
        BlockPtr view(owner->createView());
        BlockPtr sub(owner->subBlock(2, 2, 3, 3));
        BlockPtr subOfSub(sub->subBlock(1, 1, 1, 1));
        EXPECT_EQ(subOfSub->data, owner->data + 3 * 3 + 3 * owner->rowBytes);
    }
    EXPECT_EQ(host.liveBuffers(), buffers);
    EXPECT_TRUE(owner->memory->IsLocked());
    EXPECT_EQ(0, std::memcmp(owner->data, src.memory.data(), src.memory.size()));
}

TEST_F(PixelBlockTest, DetachedDescriptorLeavesStorageToItsOwner) {
    Wrapped src(kModeRGB32, 4, 12, 3, 3);
    BlockPtr owner(src->clone());
    {
        // A descriptor block borrows the owner's fields, then lets go of them.
        BlockPtr descriptor(cPixelBlock::createForMode(kModeRGB32));
        descriptor->outerRect = owner->outerRect;
        descriptor->sampling = owner->sampling;
        descriptor->memory = owner->memory;
        descriptor->detach();
        EXPECT_EQ(descriptor->memory, nullptr);
    }
    EXPECT_EQ(host.liveBuffers(), 1u);
    owner.reset();
    EXPECT_EQ(host.liveBuffers(), 0u);
}

// ---------------------------------------------------------------------------------------------------
// Refused memory

TEST_F(PixelBlockTest, RefusedAllocationThrowsAndLeaksNothing) {
    Wrapped src(kModeRGB, 1, 3, 4, 4);
    const struct {
        const char* what;
        std::function<cPixelBlock*(cPixelBlock*)> make;
    } makers[] = {
        {"clone", [](cPixelBlock* s) { return s->clone(); }},
        {"convertedTo", [](cPixelBlock* s) { return s->convertedTo(kModeRGB32); }},
        {"createEmpty", [](cPixelBlock* s) { return s->createEmpty(kModeRGB16); }},
        {"converting constructor", [](cPixelBlock* s) -> cPixelBlock* { return new cRGB32PixelBlock(kModeRGB32, s); }},
        {"copy constructor", [](cPixelBlock* s) -> cPixelBlock* { return new cRGBPixelBlock(s); }},
    };
    for (const auto& m : makers) {
        SCOPED_TRACE(m.what);
        host.failAllocationAt = host.allocations + 1;
        try {
            BlockPtr b(m.make(src.get()));
            ADD_FAILURE() << "no exception";
        } catch (const cMEMException& e) {
            EXPECT_EQ(e.message(), "could not allocate mem handle");
        }
        EXPECT_EQ(host.liveBuffers(), 0u);

        host.failAllocationAt = 0;
        host.failLocks = true;
        try {
            BlockPtr b(m.make(src.get()));
            ADD_FAILURE() << "no exception";
        } catch (const cMEMException& e) {
            EXPECT_EQ(e.message(), "could not lock handle");
        }
        host.failLocks = false;
        EXPECT_EQ(host.liveBuffers(), 0u) << "the handle of a half-built block must be freed";
    }
}

TEST_F(PixelBlockTest, StorageBeyondFourGigabytesIsRefusedNotTruncated) {
    // 32767 x 32767 working pixels need about 12 GiB; a 32-bit size would wrap to a small buffer.
    cPixelBlock huge(nullptr, cRect{0, 32767, 0, 32767}, cRect{0, 32767, 0, 32767}, 4, 12, 1, kModeRGB32, 0);
    const int before = host.allocations;
    EXPECT_THROW({ BlockPtr b(huge.createEmpty()); }, cMEMException);
    EXPECT_EQ(host.allocations, before);
}

// ---------------------------------------------------------------------------------------------------
// Copies

// Same mode, different row padding or pixel size (a host layout with an extra plane): the common
// bytes of every pixel are copied, padding and extra planes stay.
TEST_F(PixelBlockTest, CopyToCopiesTheCommonBytesAcrossLayouts) {
    const struct {
        uint32_t srcPixel, srcRow, dstPixel, dstRow;
    } cases[] = {{3, 11, 3, 13}, {3, 6, 4, 8}};
    for (const auto& t : cases) {
        Wrapped src(kModeRGB, 1, t.srcPixel, 2, 2, t.srcRow);
        Wrapped dst(kModeRGB, 1, t.dstPixel, 2, 2, t.dstRow, 0, 0, 1, 0xEE);
        for (size_t i = 0; i < src.memory.size(); ++i) src.memory[i] = uint8_t(i + 1);
        src->copyTo(dst.get());
        for (size_t i = 0; i < dst.memory.size(); ++i) {
            const size_t row = i / t.dstRow, column = i % t.dstRow / t.dstPixel, k = i % t.dstRow % t.dstPixel;
            const bool copied = column < 2 && k < 3;
            EXPECT_EQ(dst.memory[i], copied ? src.memory[row * t.srcRow + column * t.srcPixel + k] : 0xEE) << i;
        }
    }
}

TEST_F(PixelBlockTest, CopyToWithMismatchedStoredSizeLeavesDestinationUntouched) {
    const struct {
        uint16_t destinationMode;
        uint32_t bps, bpp;
        int32_t width, height;
    } cases[] = {
        {kModeRGB, 1, 3, 4, 5},     // one row more
        {kModeRGB, 1, 3, 3, 4},     // one column less
        {kModeRGB32, 4, 12, 4, 3},  // different mode, one row less
    };
    Wrapped src(kModeRGB, 1, 3, 4, 4, 0, 0, 0, 1, 0x55);
    for (const auto& t : cases) {
        Wrapped dst(t.destinationMode, t.bps, t.bpp, t.width, t.height, 0, 0, 0, 1, 0xEE);
        src->copyTo(dst.get());
        for (uint8_t byte : dst.memory) ASSERT_EQ(byte, 0xEE) << "mode " << t.destinationMode;
    }
}

TEST_F(PixelBlockTest, CopyInnerFromCopiesOnlyTheSourcesInnerRectangle) {
    // Source 6 x 6 with border 1: inner rectangle 1..5.
    std::vector<uint8_t> memory(6 * 6 * 3);
    for (size_t i = 0; i < memory.size(); ++i) memory[i] = uint8_t(i % 200 + 1);
    BlockPtr src(cPixelBlock::create(memory.data(), 6, 6, 1, 3, 1, 1, kModeRGB, 18, 0, 0));

    for (uint16_t mode : {kModeRGB, kModeRGB32}) {
        SCOPED_TRACE(mode);
        const uint32_t bps = uint32_t(modeBytesPerSample[mode]);
        Wrapped dst(mode, bps, 3 * bps, 6, 6, 0, 0, 0, 1, 0xEE);
        dst->copyInnerFrom(src.get());
        for (int r = 0; r < 6; ++r)
            for (int c = 0; c < 6; ++c) {
                const bool inner = r >= 1 && r < 5 && c >= 1 && c < 5;
                const uint8_t s = sample<uint8_t>(*src, c, r, 2);
                if (mode == kModeRGB) {
                    EXPECT_EQ(sample<uint8_t>(*dst, c, r, 2), inner ? s : 0xEE) << c << "," << r;
                } else {
                    EXPECT_EQ(sample<int32_t>(*dst, c, r, 2), inner ? int32_t(s) << 8 : int32_t(0xEEEEEEEE))
                        << c << "," << r;
                }
            }
    }
}

}  // namespace
