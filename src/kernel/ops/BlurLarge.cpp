// Iterated box blur (blurLarge) of the working and the 8-bit RGB class.
//
// Separable: P passes along rows, then P along columns, ping-ponging between two copies A and B so
// that no pass reads what it writes. The row phase covers 3 x radius extra rows above and below
// because the column passes read that far. Every position of a pass follows the cursor rule
// (positions outside the stored rectangle read and write the edge pixel); rows and columns that
// clamp to the same stored line compute the same values, so each stored line is done once. A line
// is gathered once with its clamped ends, and the running sum then walks plain pointers.
#include <cmath>
#include <cstddef>
#include <cstring>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

namespace KERNEL {
namespace {

using ops::cAxis;

template <typename T>
inline T sampleAt(const uint8_t* p) {
    T v;
    std::memcpy(&v, p, sizeof(T));
    return v;
}
template <typename T>
inline void storeAt(uint8_t* p, int32_t v) {
    const T t = T(v);
    std::memcpy(p, &t, sizeof(T));
}

struct cBoxGeometry {
    int32_t r = 0, rr = 0, n = 1, passes = 2;
    float f = 1.0f;
};

// Radius from sigma: the integer part is the box radius, a fractional part of at least one half adds
// a third pass. Sigma is clamped to 0..kMaxRadius (NaN counts as 0).
cBoxGeometry boxGeometry(float sigma, int32_t s) {
    if (!(sigma >= 0.0f)) sigma = 0.0f;
    if (sigma > float(ops::kMaxRadius)) sigma = float(ops::kMaxRadius);
    cBoxGeometry g;
    const int32_t R = int32_t(sigma);
    g.r = R / s;
    g.rr = g.r * s;
    g.n = 2 * g.r + 1;
    g.f = 1.0f / float(g.n);
    g.passes = (sigma - float(R) >= 0.5f) ? 3 : 2;
    return g;
}

// One pass along rows (kRows) or columns of `rd`'s inner rectangle into `wr`, widened by e image
// pixels along the pass direction.
template <typename T, bool kRows>
void boxPass(cPixelBlock* rd, cPixelBlock* wr, const cBoxGeometry& g, int32_t e, std::vector<int64_t>& line,
             std::vector<int64_t>& sums) {
    const int32_t s = rd->sampling;
    const cRect fr = rd->innerRect;
    const cAxis ax = ops::xAxis(rd), ay = ops::yAxis(rd);
    const cAxis wax = ops::xAxis(wr), way = ops::yAxis(wr);
    const uint32_t bpp = rd->bytesPerPixel, bps = rd->bytesPerSample, rowBytes = rd->rowBytes;
    const uint32_t wbpp = wr->bytesPerPixel, wbps = wr->bytesPerSample, wRowBytes = wr->rowBytes;
    const int32_t n = g.n;
    const float f = g.f;

    // Along the pass: positions a .. b (exclusive) of the written line, trailing and leading starts.
    const int32_t p0 = kRows ? fr.x0 : fr.y0, p1 = kRows ? fr.x1 : fr.y1;
    const int32_t a = int32_t(int64_t(p0) - e), b = int32_t(int64_t(p1) + e);
    const int32_t m = ops::stepCount(a, b, s);
    if (m <= 0) return;
    const cAxis along = kRows ? ax : ay, walong = kRows ? wax : way;
    const int32_t t0 = along.rel(a - g.rr, s);
    const int32_t l0 = along.rel(a + g.rr, s);
    const int32_t w0 = walong.rel(a, s);

    // Across the pass: the stored lines the frame's lines clamp to (monotonic, so duplicates are
    // neighbours).
    const int32_t q0 = kRows ? fr.y0 : fr.x0, q1 = kRows ? fr.y1 : fr.x1;
    const cAxis across = kRows ? ay : ax, wacross = kRows ? way : wax;

    if constexpr (kRows) {
        // Gathered samples cover stored indices lo .. hi of the read row.
        const int32_t lo = std::min(t0, l0), hi = std::max(t0 + n - 1 + m, l0 + m);
        const size_t len = size_t(int64_t(hi) - lo + 1);
        line.resize(len * 3);
        int32_t lastRead = INT32_MIN, lastWrite = INT32_MIN;
        for (int32_t q = q0; q < q1; q += s) {
            const int32_t rowR = across.clamp(across.rel(q, s));
            const int32_t rowW = wacross.clamp(wacross.rel(q, s));
            if (rowR == lastRead && rowW == lastWrite) continue;
            lastRead = rowR;
            lastWrite = rowW;
            const uint8_t* src = rd->data + size_t(rowR) * rowBytes;
            const ops::cRun gr = ops::splitRun(lo, int32_t(len), along.size);
            int64_t* L = line.data();
            auto put = [&](const uint8_t* px) {
                L[0] = sampleAt<T>(px);
                L[1] = sampleAt<T>(px + bps);
                L[2] = sampleAt<T>(px + 2 * bps);
                L += 3;
            };
            for (int32_t i = 0; i < gr.before; ++i) put(src);
            const uint8_t* px = src + size_t(gr.first) * bpp;
            for (int32_t i = 0; i < gr.inside; ++i, px += bpp) put(px);
            const uint8_t* lastPx = src + size_t(along.size - 1) * bpp;
            for (int32_t i = 0; i < gr.after; ++i) put(lastPx);

            const int64_t* trail = line.data() + size_t(t0 - lo) * 3;
            const int64_t* lead = line.data() + size_t(l0 - lo) * 3;
            int64_t S0 = 0, S1 = 0, S2 = 0;
            for (int32_t k = 0; k < n; ++k) {
                S0 += trail[3 * k];
                S1 += trail[3 * k + 1];
                S2 += trail[3 * k + 2];
            }
            uint8_t* dstRow = wr->data + size_t(rowW) * wRowBytes;
            const ops::cRun wrun = ops::splitRun(w0, m, walong.size);
            uint8_t* out = dstRow;
            int32_t done = 0;
            auto emit = [&](uint8_t* o) {
                storeAt<T>(o, int32_t(float(S0) * f));
                storeAt<T>(o + wbps, int32_t(float(S1) * f));
                storeAt<T>(o + 2 * wbps, int32_t(float(S2) * f));
                S0 -= trail[0];
                S1 -= trail[1];
                S2 -= trail[2];
                trail += 3;
                lead += 3;
                if (++done < m) {
                    S0 += lead[0];
                    S1 += lead[1];
                    S2 += lead[2];
                }
            };
            for (int32_t i = 0; i < wrun.before; ++i) emit(out);
            out = dstRow + size_t(wrun.first) * wbpp;
            for (int32_t i = 0; i < wrun.inside; ++i, out += wbpp) emit(out);
            out = dstRow + size_t(walong.size - 1) * wbpp;
            for (int32_t i = 0; i < wrun.after; ++i) emit(out);
        }
    } else {
        // Columns: mark the distinct stored columns, then run all their sums down together.
        std::vector<uint8_t> mark(size_t(across.size), 0);
        for (int32_t q = q0; q < q1; q += s) mark[size_t(across.clamp(across.rel(q, s)))] = 1;
        // Read and written columns coincide when both blocks share the grid (always, for A and B).
        const size_t cols = size_t(across.size);
        sums.assign(cols * 3, 0);
        auto rowPtr = [&](int32_t rel) { return rd->data + size_t(along.clamp(rel)) * rowBytes; };
        for (int32_t k = 0; k < n; ++k) {
            const uint8_t* r = rowPtr(t0 + k);
            for (size_t c = 0; c < cols; ++c) {
                if (!mark[c]) continue;
                const uint8_t* px = r + c * bpp;
                sums[3 * c] += sampleAt<T>(px);
                sums[3 * c + 1] += sampleAt<T>(px + bps);
                sums[3 * c + 2] += sampleAt<T>(px + 2 * bps);
            }
        }
        // Contiguous runs of marked columns, so the inner loop walks plain pointers.
        std::vector<std::pair<size_t, size_t>> runs;
        for (size_t c = 0; c < cols;) {
            if (!mark[c]) {
                ++c;
                continue;
            }
            size_t e2 = c;
            while (e2 < cols && mark[e2]) ++e2;
            runs.emplace_back(c, e2);
            c = e2;
        }
        const int32_t wcolOffset = across.origin - wacross.origin;
        for (int32_t j = 0; j < m; ++j) {
            uint8_t* wRow = wr->data + size_t(walong.clamp(w0 + j)) * wRowBytes;
            const uint8_t* tRow = rowPtr(t0 + j);
            const uint8_t* lRow = rowPtr(l0 + j + 1);
            const bool more = j + 1 < m;
            for (const auto& [c0, c1] : runs) {
                int64_t* S = sums.data() + 3 * c0;
                const uint8_t* tp = tRow + c0 * bpp;
                const uint8_t* lp = lRow + c0 * bpp;
                for (size_t c = c0; c < c1; ++c, S += 3, tp += bpp, lp += bpp) {
                    const int32_t wc = wacross.clamp(int32_t(c) + wcolOffset);
                    uint8_t* o = wRow + size_t(wc) * wbpp;
                    storeAt<T>(o, int32_t(float(S[0]) * f));
                    storeAt<T>(o + wbps, int32_t(float(S[1]) * f));
                    storeAt<T>(o + 2 * wbps, int32_t(float(S[2]) * f));
                    S[0] -= sampleAt<T>(tp);
                    S[1] -= sampleAt<T>(tp + bps);
                    S[2] -= sampleAt<T>(tp + 2 * bps);
                    if (more) {
                        S[0] += sampleAt<T>(lp);
                        S[1] += sampleAt<T>(lp + bps);
                        S[2] += sampleAt<T>(lp + 2 * bps);
                    }
                }
            }
        }
    }
}

}  // namespace

// Shared by both classes; T is the sample type.
template <typename T>
void boxBlurLarge(cPixelBlock* self, float sigma, cPixelBlock* destination, cMargin margin) {
    if (!ops::usable(self) || !ops::usable(destination)) return;
    const cBoxGeometry g = boxGeometry(sigma, self->sampling);
    ops::BlockPtr A = ops::lockedClone(self);
    ops::BlockPtr B = ops::lockedClone(destination);
    std::vector<int64_t> line, sums;
    cPixelBlock* rd = A.get();
    cPixelBlock* wr = B.get();
    {
        const int64_t dy = int64_t(margin.dy) + 3 * int64_t(g.rr);
        ops::cMarginScope scopeA({self, destination}, margin.dx, ops::saturate32(dy));
        ops::cMarginScope scopeB({A.get(), B.get()}, margin.dx, ops::saturate32(dy));
        for (int32_t k = 1; k <= g.passes; ++k) {
            boxPass<T, true>(rd, wr, g, (g.passes - k) * g.rr, line, sums);
            std::swap(rd, wr);
        }
    }
    ops::cMarginScope scopeA({self, destination}, margin.dx, margin.dy);
    ops::cMarginScope scopeB({A.get(), B.get()}, margin.dx, margin.dy);
    for (int32_t k = 1; k <= g.passes; ++k) {
        boxPass<T, false>(rd, wr, g, (g.passes - k) * g.rr, line, sums);
        std::swap(rd, wr);
    }
    // rd now holds the last written block.
    const cRect area = destination->innerRect;
    cPixelBlock::copyRegion(rd, destination, area.x0, area.y0, area.x0, area.y0, area);
}

void cRGB32PixelBlock::blurLarge(float sigma, cPixelBlock* destination, cMargin margin) {
    boxBlurLarge<int32_t>(this, sigma, destination, margin);
}

// The 8-bit class runs the same iterated box on its bytes; a box mean of bytes stays in 0..255.
void cRGBPixelBlock::blurLarge(float sigma, cPixelBlock* destination, cMargin margin) {
    boxBlurLarge<uint8_t>(this, sigma, destination, margin);
}

}  // namespace KERNEL
