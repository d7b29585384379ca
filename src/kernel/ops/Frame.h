// Shared helpers of the block operations: margin scopes, the stored-grid mapping of the cursor, and
// frame walkers that follow the cursor rule (edge pixels repeat outside the stored rectangle).
#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <memory>
#include <vector>

#include "kernel/PixelBlock.h"

namespace KERNEL::ops {

// Window radii (stored pixels) and blur radii are clamped to this: a padded tile is at most 300 x 300
// plus borders, so a wider window only repeats edge pixels, and a radius from the settings text of a
// million must neither overflow a window size nor keep the host waiting.
constexpr int32_t kMaxRadius = 150;

using BlockPtr = std::unique_ptr<cPixelBlock>;

inline int16_t saturate16(int64_t v) {
    return int16_t(std::clamp<int64_t>(v, std::numeric_limits<int16_t>::min(), std::numeric_limits<int16_t>::max()));
}
inline int32_t saturate32(int64_t v) {
    return int32_t(std::clamp<int64_t>(v, std::numeric_limits<int32_t>::min(), std::numeric_limits<int32_t>::max()));
}

inline cRect widened(const cRect& r, int32_t dx, int32_t dy) {
    return {saturate16(int64_t(r.x0) - dx), saturate16(int64_t(r.x1) + dx), saturate16(int64_t(r.y0) - dy),
            saturate16(int64_t(r.y1) + dy)};
}

// Widens the inner rectangles of up to four blocks for one operation and restores them on exit,
// also when an exception passes. The same block may be named twice (destination == receiver).
class cMarginScope {
public:
    cMarginScope(std::initializer_list<cPixelBlock*> blocks, int32_t dx, int32_t dy) {
        for (cPixelBlock* b : blocks) {
            if (b == nullptr || count_ == saved_.size()) continue;
            bool seen = false;
            for (size_t i = 0; i < count_; ++i) seen = seen || saved_[i].first == b;
            if (seen) continue;
            saved_[count_++] = {b, b->innerRect};
        }
        for (size_t i = 0; i < count_; ++i) saved_[i].first->innerRect = widened(saved_[i].second, dx, dy);
    }
    ~cMarginScope() {
        for (size_t i = 0; i < count_; ++i) saved_[i].first->innerRect = saved_[i].second;
    }
    cMarginScope(const cMarginScope&) = delete;
    cMarginScope& operator=(const cMarginScope&) = delete;

private:
    std::array<std::pair<cPixelBlock*, cRect>, 4> saved_{};
    size_t count_ = 0;
};

// Image coordinate to stored grid, exactly as getPixel maps it.
inline int32_t toStored(int32_t v, int32_t s) { return (s == 1 || s == 0) ? v : (v + v % s) / s; }

// Number of positions of `for (v = a; v < b; v += s)`.
inline int32_t stepCount(int32_t a, int32_t b, int32_t s) {
    return b > a ? int32_t((int64_t(b) - a + s - 1) / s) : 0;
}

// Stored extent of a block along one axis.
struct cAxis {
    int32_t origin = 0;  // first stored index (outer / sampling)
    int32_t size = 0;    // stored count
    // Stored index, relative to the origin, of image coordinate v, not yet clamped.
    int32_t rel(int32_t v, int32_t s) const { return toStored(v, s) - origin; }
    int32_t clamp(int32_t i) const { return i < 0 ? 0 : (i >= size ? size - 1 : i); }
};
inline cAxis xAxis(const cPixelBlock* b) {
    const int32_t s = b->sampling;
    return {b->outerRect.x0 / s, b->outerRect.x1 / s - b->outerRect.x0 / s};
}
inline cAxis yAxis(const cPixelBlock* b) {
    const int32_t s = b->sampling;
    return {b->outerRect.y0 / s, b->outerRect.y1 / s - b->outerRect.y0 / s};
}

inline bool usable(const cPixelBlock* b) {
    return b != nullptr && b->data != nullptr && b->sampling > 0 && b->outerRect.width() > 0 &&
           b->outerRect.height() > 0 && b->storedColumns() > 0 && b->storedRows() > 0;
}

// A cursor that starts at stored index `rel` (unclamped) and moves n - 1 times visits
// clamp(rel + i). The n positions split into a run on the first stored pixel, a run that advances
// one stored pixel per step, and a run on the last stored pixel.
struct cRun {
    int32_t before = 0;  // positions on index 0
    int32_t inside = 0;  // positions that advance, starting at `first`
    int32_t after = 0;   // positions on index size - 1
    int32_t first = 0;
};
inline cRun splitRun(int32_t rel, int32_t n, int32_t size) {
    cRun r;
    if (n <= 0) return r;
    const int64_t lo = std::max<int64_t>(0, -int64_t(rel));               // first i with rel + i >= 0
    const int64_t hi = std::min<int64_t>(n, int64_t(size) - rel);         // first i with rel + i >= size
    r.before = int32_t(std::min<int64_t>(lo, n));
    r.inside = int32_t(std::max<int64_t>(0, hi - lo));
    r.after = n - r.before - r.inside;
    r.first = r.inside > 0 ? int32_t(rel + lo) : 0;
    return r;
}

// Walks the frame (inner rectangle, steps of `sampling`) of blocks[0] with one int32 sample pointer
// per block, all placed at the same image position, and calls fn(p) per position with the
// pointers of the pixel's channel 0. Every block must hold 32-bit samples. Positions outside a
// block's stored rectangle repeat its edge pixel exactly as a cursor does (a pixel is visited again
// for every clamped position, so read-modify-write passes apply repeatedly there).
// kReference walks with cPixel cursors one step at a time; the default splits each row into the
// clamped runs and walks the interior with plain pointers. Both give the same result.
template <size_t N, bool kReference = false, class Fn>
void forEachPixel(const std::array<cPixelBlock*, N>& blocks, Fn&& fn) {
    cPixelBlock* lead = blocks[0];
    for (cPixelBlock* b : blocks)
        if (!usable(b)) return;
    const int32_t s = lead->sampling;
    const cRect frame = lead->innerRect;
    const int32_t n = stepCount(frame.x0, frame.x1, s);
    bool sameGrid = true;
    for (cPixelBlock* b : blocks)
        sameGrid = sameGrid && b->outerRect == lead->outerRect && b->sampling == s;
    std::array<int32_t*, N> p{};
    std::array<cPixel, N> c{};
    for (int32_t y = frame.y0; y < frame.y1; y += s) {
        for (size_t k = 0; k < N; ++k) blocks[k]->getPixel(c[k], frame.x0, y);
        if (kReference || !sameGrid) {
            for (int32_t i = 0; i < n; ++i) {
                for (size_t k = 0; k < N; ++k) p[k] = &c[k].s32(0);
                fn(p.data());
                for (size_t k = 0; k < N; ++k) c[k].right();
            }
            continue;
        }
        const int32_t rel = int32_t(c[0].column) - int32_t(c[0].clampLeft) + int32_t(c[0].clampRight);
        const cRun run = splitRun(rel, n, int32_t(c[0].column + c[0].columnsLeft));
        const uint32_t step = lead->bytesPerPixel;
        std::array<uint8_t*, N> base{};
        for (size_t k = 0; k < N; ++k) base[k] = c[k].channel[0] - size_t(c[k].column) * step;
        for (size_t k = 0; k < N; ++k) p[k] = reinterpret_cast<int32_t*>(base[k]);
        for (int32_t i = 0; i < run.before; ++i) fn(p.data());
        if (run.inside > 0) {
            std::array<uint8_t*, N> q{};
            for (size_t k = 0; k < N; ++k) q[k] = base[k] + size_t(run.first) * step;
            for (int32_t i = 0; i < run.inside; ++i) {
                for (size_t k = 0; k < N; ++k) p[k] = reinterpret_cast<int32_t*>(q[k]);
                fn(p.data());
                for (size_t k = 0; k < N; ++k) q[k] += step;
            }
        }
        if (run.after > 0) {
            const size_t last = size_t(c[0].column + c[0].columnsLeft - 1) * step;
            for (size_t k = 0; k < N; ++k) p[k] = reinterpret_cast<int32_t*>(base[k] + last);
            for (int32_t i = 0; i < run.after; ++i) fn(p.data());
        }
    }
}

// The plain cursor walk over the frame of `recv` with a destination cursor alongside (dst may be
// null); fn(src cursor, dst cursor, x, y). For the operations off the hot path.
template <class Fn>
void walkFrame(cPixelBlock* recv, cPixelBlock* dst, Fn&& fn) {
    if (!usable(recv) || (dst != nullptr && !usable(dst))) return;
    const int32_t s = recv->sampling;
    const cRect f = recv->innerRect;
    cPixel a, b;
    for (int32_t y = f.y0; y < f.y1; y += s) {
        recv->getPixel(a, f.x0, y);
        if (dst) dst->getPixel(b, f.x0, y);
        for (int32_t x = f.x0; x < f.x1; x += s) {
            fn(a, b, x, y);
            a.right();
            if (dst) b.right();
        }
    }
}

// Pointer to the stored pixel one stored step away from a cursor's pixel, clamped to the block.
inline uint8_t* neighbour(const cPixel& c, int32_t dx, int32_t dy) {
    const int32_t cols = int32_t(c.column + c.columnsLeft), rows = int32_t(c.row + c.rowsLeft);
    const int32_t nx = std::clamp(int32_t(c.column) + dx, 0, cols - 1);
    const int32_t ny = std::clamp(int32_t(c.row) + dy, 0, rows - 1);
    return c.channel[0] + (int64_t(nx) - c.column) * int64_t(c.pixelStep) + (int64_t(ny) - c.row) * int64_t(c.rowStep);
}

inline uint8_t clamp8(int64_t v) { return uint8_t(v < 0 ? 0 : (v > 255 ? 255 : v)); }

// A locked temporary copy that is deleted when the scope ends.
inline BlockPtr lockedClone(cPixelBlock* b) {
    BlockPtr p(b->clone());
    p->lock();
    return p;
}

}  // namespace KERNEL::ops
