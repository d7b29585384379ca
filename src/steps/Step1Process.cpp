// Step 1's variants on Lab: a chroma median held near the input by a limit, and in some modes a
// smoothing of L across the edges of the 8 x 8 grid followed by a pass that lifts isolated bright L samples.
#include <cstddef>
#include <cstdint>
#include <memory>

#include "kernel/PixelBlock.h"
#include "steps/Step1.h"
#include "steps/Step34Support.h"

namespace {

using BlockPtr = std::unique_ptr<KERNEL::cPixelBlock>;
using KERNEL::cPixel;
using KERNEL::cPixelBlock;

constexpr int32_t kChannelL = 0;
constexpr int32_t kChannelA = 1;
constexpr int32_t kChannelB = 2;
constexpr int32_t kGrid = 8;

bool isCopyMode(int32_t mode) {
    return mode == 0 || mode == 100 || mode == 101 || mode == 104 || mode == 107 || mode == 108;
}

struct ChromaMedian {
    int32_t radius = 0;
    bool filter = false;
    bool limited = false;
    int64_t limit = 0;
};

ChromaMedian chooseMedian(const cStep1& s) {
    auto with = [](int32_t radius, bool limited, int64_t limit) {
        // A negative limit (a percentage above 100) would push the chroma further from the median
        // than the input is; the nearest sane meaning is "no change", a limit of 0.
        return ChromaMedian{radius, true, limited, limit < 0 ? 0 : limit};
    };
    switch (s.mode) {
        case 1: return with(s.medianRadius1, false, 0);
        case 2: return with(s.medianRadius2, true, (100 - int64_t(s.chromaLimitPercent)) * 128);
        case 3:
            switch (s.preset3) {
                case 0: return with(3, true, 640);
                case 1: return with(4, true, 1280);
                case 2: return with(6, true, 2560);
                case 3: return with(9, true, 4480);
                case 4: return with(4, true, 2560);
                default: return {};
            }
        case 4: return with(s.medianRadius4, true, 2560);
        default: break;
    }
    if (s.mode >= 100) return with(8, true, 2560);
    return {};
}

BlockPtr workingCopy(cPixelBlock* src) {
    BlockPtr b(src->clone());
    b->lock();
    return b;
}

// The median, moved to at most `limit` from the input sample.
inline int32_t limitedChroma(int64_t input, int64_t median, const ChromaMedian& cm) {
    if (!cm.limited) return int32_t(median);
    const int64_t diff = input - median;
    if ((diff < 0 ? -diff : diff) < cm.limit) return int32_t(median);
    // Lies between median and input, so it fits the sample type.
    return int32_t(input > median ? input - cm.limit : input + cm.limit);
}

void mergePass(cPixelBlock* dst, const cPixelBlock* input, const cPixelBlock* median, const ChromaMedian& cm) {
    const KERNEL::cRect r = dst->innerRect;
    const int32_t s = dst->sampling;
    if (s <= 0 || dst->data == nullptr) return;
    cPixel d, in, med;
    for (int64_t y = r.y0; y < r.y1; y += s) {
        dst->getPixel(d, r.x0, int32_t(y));
        input->getPixel(in, r.x0, int32_t(y));
        median->getPixel(med, r.x0, int32_t(y));
        for (int64_t x = r.x0; x < r.x1; x += s) {
            const int32_t l = med.s32(kChannelL);
            const int32_t a = limitedChroma(in.s32(kChannelA), med.s32(kChannelA), cm);
            const int32_t b = limitedChroma(in.s32(kChannelB), med.s32(kChannelB), cm);
            d.s32(kChannelL) = l;
            d.s32(kChannelA) = a;
            d.s32(kChannelB) = b;
            d.right();
            in.right();
            med.right();
        }
    }
}

// The edge rule on L: a is next to the cell edge, b the next one inward, c across the edge. Only a
// step at the edge that the inside does not share is softened; both values come from the snapshot,
// and a is written before b (where a cursor is clamped both land on one pixel and b wins).
struct EdgeRule {
    int64_t soft;  // below this |a - b| both samples are blended
    int64_t hard;  // below this only a is pulled toward c

    void operator()(int32_t a32, int32_t b32, int32_t c32, int32_t& outA, int32_t& outB) const {
        const int64_t a = a32, b = b32, c = c32;
        const int64_t dab = a > b ? a - b : b - a;
        const int64_t dac = a > c ? a - c : c - a;
        const int64_t dbc = b > c ? b - c : c - b;
        if (!(dac > dab && dbc < 5000)) return;
        if (dab < soft) {
            // Weighted means: each lies between the smallest and largest of a, b, c.
            const int32_t na = int32_t((3 * a + b + 2 * c) / 6);
            const int32_t nb = int32_t((a + 7 * b + c) / 9);
            outA = na;
            outB = nb;
        } else if (dab < hard) {
            outA = int32_t((3 * a + c) / 4);
        }
    }
};

// First cell origin of the grid loops: the coordinate less its truncated remainder by 8.
inline int32_t cellStart(int32_t v) { return v - v % kGrid; }

// Edges between rows: the top two and bottom two rows of every cell, read from `snap`, written to dst.
void rowPass(const cPixelBlock* src, const cPixelBlock* snap, cPixelBlock* dst, const EdgeRule& rule) {
    const KERNEL::cRect r = src->innerRect;
    cPixel topC, topA, topB, botB, botA, botC, dTopA, dTopB, dBotA, dBotB;
    for (int32_t cy = cellStart(r.y0); cy < r.y1; cy += kGrid) {
        for (int32_t cx = cellStart(r.x0); cx < r.x1; cx += kGrid) {
            snap->getPixel(topC, cx, cy - 1);
            snap->getPixel(topA, cx, cy);
            snap->getPixel(topB, cx, cy + 1);
            snap->getPixel(botB, cx, cy + 6);
            snap->getPixel(botA, cx, cy + 7);
            snap->getPixel(botC, cx, cy + 8);
            dst->getPixel(dTopA, cx, cy);
            dst->getPixel(dTopB, cx, cy + 1);
            dst->getPixel(dBotA, cx, cy + 7);
            dst->getPixel(dBotB, cx, cy + 6);
            for (int32_t i = 0; i < kGrid; ++i) {
                rule(topA.s32(kChannelL), topB.s32(kChannelL), topC.s32(kChannelL), dTopA.s32(kChannelL),
                     dTopB.s32(kChannelL));
                rule(botA.s32(kChannelL), botB.s32(kChannelL), botC.s32(kChannelL), dBotA.s32(kChannelL),
                     dBotB.s32(kChannelL));
                for (cPixel* p : {&topC, &topA, &topB, &botB, &botA, &botC, &dTopA, &dTopB, &dBotA, &dBotB})
                    p->right();
            }
        }
    }
}

// Edges between columns: the left two and right two columns of every cell.
void columnPass(const cPixelBlock* src, const cPixelBlock* snap, cPixelBlock* dst, const EdgeRule& rule) {
    const KERNEL::cRect r = src->innerRect;
    cPixel leftC, leftA, leftB, rightB, rightA, rightC, dLeftA, dLeftB, dRightA, dRightB;
    for (int32_t cy = cellStart(r.y0); cy < r.y1; cy += kGrid) {
        for (int32_t cx = cellStart(r.x0); cx < r.x1; cx += kGrid) {
            snap->getPixel(leftC, cx - 1, cy);
            snap->getPixel(leftA, cx, cy);
            snap->getPixel(leftB, cx + 1, cy);
            snap->getPixel(rightB, cx + 6, cy);
            snap->getPixel(rightA, cx + 7, cy);
            snap->getPixel(rightC, cx + 8, cy);
            dst->getPixel(dLeftA, cx, cy);
            dst->getPixel(dLeftB, cx + 1, cy);
            dst->getPixel(dRightA, cx + 7, cy);
            dst->getPixel(dRightB, cx + 6, cy);
            for (int32_t i = 0; i < kGrid; ++i) {
                rule(leftA.s32(kChannelL), leftB.s32(kChannelL), leftC.s32(kChannelL), dLeftA.s32(kChannelL),
                     dLeftB.s32(kChannelL));
                rule(rightA.s32(kChannelL), rightB.s32(kChannelL), rightC.s32(kChannelL), dRightA.s32(kChannelL),
                     dRightB.s32(kChannelL));
                for (cPixel* p : {&leftC, &leftA, &leftB, &rightB, &rightA, &rightC, &dLeftA, &dLeftB, &dRightA,
                                  &dRightB})
                    p->down();
            }
        }
    }
}

// Raises or keeps each L sample by a quarter of how far it stands above the mean of its four
// neighbours, when that lies between 2001 and 19999. The neighbours come from the snapshot, the
// sample itself from dst. The pass walks the snapshot's inner rectangle one stored pixel at a time
// (in steps of the sampling factor) with its neighbours one stored pixel away, so at any sampling
// every stored pixel of the rectangle is tested exactly once.
void speckPass(const cPixelBlock* snap, cPixelBlock* dst) {
    const KERNEL::cRect r = snap->innerRect;
    const int32_t s = snap->sampling;
    if (s <= 0) return;
    cPixel north, south, west, centre, east, d;
    for (int64_t y = r.y0; y < r.y1; y += s) {
        const int32_t yy = int32_t(y);
        // Neighbours are reached by cursor moves from the row above and the column to the left, so
        // at the block's edges they repeat the edge pixel exactly as the cursor rule says.
        snap->getPixel(north, r.x0 - s, yy - s);
        west = north;
        west.down();
        south = west;
        south.down();
        north.right();
        south.right();
        centre = west;
        centre.right();
        east = centre;
        east.right();
        dst->getPixel(d, r.x0, yy);
        for (int64_t x = r.x0; x < r.x1; x += s) {
            const int64_t avg = (int64_t(north.s32(kChannelL)) + south.s32(kChannelL) + west.s32(kChannelL) +
                                 east.s32(kChannelL)) >> 2;
            const int64_t diff = d.s32(kChannelL) - avg;
            if (diff >= 2001 && diff <= 19999)
                d.s32(kChannelL) = steps::saturate32(centre.s32(kChannelL) + (diff >> 2));
            for (cPixel* p : {&north, &south, &west, &centre, &east, &d}) p->right();
        }
    }
}

}  // namespace

void cStep1::Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) {
    if (src == nullptr || dst == nullptr) return;
    if (isCopyMode(mode)) {
        src->copyTo(dst);
        return;
    }

    // Released however Process ends.
    BlockPtr w1 = workingCopy(src);
    BlockPtr w2 = workingCopy(src);

    const ChromaMedian cm = chooseMedian(*this);
    if (cm.filter) {
        w1->medianFilter(cm.radius, 255, kChannelA, 8, w2.get());
        w1->medianFilter(cm.radius, 255, kChannelB, 8, w2.get());
    }
    mergePass(dst, w1.get(), w2.get(), cm);

    const bool smoothGrid = mode == 4 || mode == 105 || (mode == 3 && preset3 == 4);
    if (!smoothGrid) return;
    const int64_t strength = mode == 3 ? 100 : edgeStrength;
    const EdgeRule rule{60 * strength, 300 * strength};

    dst->copyTo(w1.get());
    // The grid only lines up with stored pixels at full resolution. The cell loops of one axis would
    // still run when the other axis is empty, so an empty rectangle skips them outright.
    const KERNEL::cRect& r = src->innerRect;
    if (src->sampling == 1 && r.x0 < r.x1 && r.y0 < r.y1) {
        rowPass(src, w1.get(), dst, rule);
        dst->copyTo(w1.get());
        columnPass(src, w1.get(), dst, rule);
        dst->copyTo(w1.get());
    }
    speckPass(w1.get(), dst);
}
