// The sliding-window histogram shared by the median and the rank range filter.
//
// Per frame row the window (n x n stored pixels around the row's first position) is counted once;
// each following position removes the column leaving on the left and adds the one entering on the
// right (2n samples), and the tracked quantiles move only by the change of the counts. The window's
// rows and columns follow a cursor walked from the window's top-left corner, so positions outside
// the stored rectangle repeat the edge.
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "kernel/ops/Frame.h"

namespace KERNEL::ops {

// Bits outside 6..9 are clamped into that range.
struct cBins {
    int32_t count;
    int32_t shift;
    explicit cBins(int32_t bits) {
        bits = std::clamp(bits, 6, 9);
        count = 1 << bits;
        shift = 16 - bits;
    }
    // Samples outside 0..65535 (Lab a/b may be -1; earlier steps may overshoot) fall into the end bins.
    int32_t of(int32_t v) const {
        const int32_t b = v >> shift;
        return b < 0 ? 0 : (b >= count ? count - 1 : b);
    }
};

// The smallest bin whose cumulative count reaches `rank`; rank is kept within 1..total so the bin
// always exists.
struct cQuantile {
    int32_t rank = 1;
    int32_t bin = 0;
    int32_t cum = 0;
    void start(const int32_t* h) {
        bin = 0;
        cum = h[0];
        settle(h);
    }
    void added(int32_t b) { cum += (b <= bin); }
    void removed(int32_t b) { cum -= (b <= bin); }
    void settle(const int32_t* h) {
        while (cum < rank) cum += h[++bin];
        while (cum - h[bin] >= rank) cum -= h[bin--];
    }
};

// Walks the frame of `recv` (widened already) with the sliding histogram of channel c. For each
// position, visit(i, centre, dstPixel, quantiles) where i is the position's index in its row
// (0 = first of the row). T is the sample type; read(p) gives the working-scale value of sample p.
template <typename T, int kQ, class Read, class Visit>
void slideHistogram(cPixelBlock* recv, cPixelBlock* dst, int32_t r, int32_t c, const cBins& bins,
                    cQuantile (&q)[kQ], Read read, Visit visit) {
    if (!usable(recv) || !usable(dst)) return;
    const int32_t s = recv->sampling;
    const cRect f = recv->innerRect;
    const cAxis ax = xAxis(recv), ay = yAxis(recv);
    const int32_t n = 2 * r + 1;
    const int32_t npos = stepCount(f.x0, f.x1, s);
    if (npos <= 0) return;
    const uint32_t bpp = recv->bytesPerPixel;
    const size_t chan = size_t(c) * recv->bytesPerSample;
    const int32_t left = ax.rel(int32_t(int64_t(f.x0) - int64_t(r) * s), s);
    const int32_t centre0 = ax.rel(f.x0, s);
    const cRun crun = splitRun(centre0, npos, ax.size);

    int32_t hist[512];
    std::vector<const uint8_t*> rows(static_cast<size_t>(n));
    // Byte offsets of the window's columns: left + k for k = 0 .. n - 1 + npos - 1, clamped.
    std::vector<size_t> colOff(static_cast<size_t>(n) + static_cast<size_t>(npos));
    for (size_t k = 0; k < colOff.size(); ++k)
        colOff[k] = size_t(ax.clamp(int32_t(int64_t(left) + int64_t(k)))) * bpp + chan;

    cPixel dc;
    for (int32_t y = f.y0; y < f.y1; y += s) {
        const int32_t top = ay.rel(int32_t(int64_t(y) - int64_t(r) * s), s);
        for (int32_t k = 0; k < n; ++k) rows[size_t(k)] = recv->data + size_t(ay.clamp(top + k)) * recv->rowBytes;
        const uint8_t* centreRow = recv->data + size_t(ay.clamp(ay.rel(y, s))) * recv->rowBytes + chan;

        std::memset(hist, 0, sizeof(int32_t) * size_t(bins.count));
        for (int32_t k = 0; k < n; ++k)
            for (int32_t j = 0; j < n; ++j) ++hist[bins.of(read(rows[size_t(k)] + colOff[size_t(j)]))];
        for (auto& qq : q) qq.start(hist);

        dst->getPixel(dc, f.x0, y);
        const uint8_t* centre = centreRow + size_t(crun.before > 0 ? 0 : crun.first) * bpp;
        int32_t centreIndex = crun.before > 0 ? 0 : crun.first;
        for (int32_t i = 0; i < npos; ++i) {
            if (i > 0) {
                const size_t out = colOff[size_t(i - 1)], in = colOff[size_t(i - 1 + n)];
                for (int32_t k = 0; k < n; ++k) {
                    const int32_t bo = bins.of(read(rows[size_t(k)] + out));
                    --hist[bo];
                    for (auto& qq : q) qq.removed(bo);
                    const int32_t bi = bins.of(read(rows[size_t(k)] + in));
                    ++hist[bi];
                    for (auto& qq : q) qq.added(bi);
                }
                for (auto& qq : q) qq.settle(hist);
                // Centre follows the cursor rule of its own walk.
                const int32_t want = ax.clamp(int32_t(int64_t(centre0) + i));
                if (want != centreIndex) {
                    centre += size_t(want - centreIndex) * bpp;
                    centreIndex = want;
                }
            }
            visit(i, read(centre), dc, q);
            dc.right();
        }
    }
}

}  // namespace KERNEL::ops
