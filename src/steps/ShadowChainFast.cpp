#include "steps/ShadowChainFast.h"

#include <algorithm>
#include <cstddef>
#include <cstring>

#include "kernel/Lab.h"
#include "kernel/PixelBlock.h"
#include "kernel/StageTimer.h"
#include "kernel/WorkerPool.h"

using KERNEL::cPixelBlock;

namespace {

// blur(6.0): a 13-pixel box, twice along each axis; step 2 asks for 20 pixels around the core and
// the Lab conversion for 30.
constexpr int32_t kR = 6;
constexpr int32_t kN = 2 * kR + 1;
constexpr int32_t kStep2Border = 20;
constexpr int32_t kLabBorder = 30;
constexpr int32_t kColumnChunk = 16;  // columns per vertical sweep: its scratch stays in L1/L2

inline int32_t clampIndex(int64_t v, int32_t size) { return int32_t(v < 0 ? 0 : (v >= size ? size - 1 : v)); }

// One box pass over positions [a, b) of a line of `size` stored pixels. Each position writes the
// stored index it clamps to, in increasing order, so an index keeps its last writer: itself inside
// the line, and the pass's last position b - 1 for the last index.
struct cPass {
    int32_t a, b, size, lo, hi;
    cPass(int32_t a, int32_t b, int32_t size)
        : a(a), b(b), size(size), lo(clampIndex(a, size)), hi(clampIndex(int64_t(b) - 1, size) + 1) {}
    int32_t pos(int32_t i) const { return i == hi - 1 ? b - 1 : i; }
    // Indices to compute for the wanted range [n0, n1).
    int32_t from(int32_t n0) const { return std::max(lo, n0); }
    int32_t to(int32_t n1) const { return std::min(hi, n1); }
    bool special(int32_t i0, int32_t i1) const { return hi - 1 >= i0 && hi - 1 < i1 && b - 1 != hi - 1; }
    // Stored indices the computed range [i0, i1) reads.
    int32_t readFrom(int32_t i0, int32_t i1) const {
        const int64_t first = special(i0, i1) ? std::min<int64_t>(i0, int64_t(b) - 1) : i0;
        return clampIndex(first - kR, size);
    }
    int32_t readTo(int32_t i0, int32_t i1) const {
        const int64_t last = special(i0, i1) ? std::max<int64_t>(i1 - 1, int64_t(b) - 1) : i1 - 1;
        return clampIndex(last + kR, size) + 1;
    }
};

// How many positions of [a, b) clamp to stored index y: the mix pass runs once per position.
int64_t multiplicity(int32_t y, int32_t a, int32_t b, int32_t size) {
    const int64_t lo = y == 0 ? INT64_MIN / 2 : y, hi = y == size - 1 ? INT64_MAX / 2 : int64_t(y) + 1;
    return std::max<int64_t>(0, std::min<int64_t>(b, hi) - std::max<int64_t>(a, lo));
}

inline int32_t boxMean(int32_t sum) {
    static const float f = 1.0f / float(kN);
    return int32_t(float(sum) * f);
}

// Running box along an interleaved line: ext holds positions i0 - kR .. i0 + count - 1 + kR
// (already clamped), out receives `count` pixels.
void boxLine(const int32_t* __restrict ext, int32_t count, int32_t* __restrict out) {
    int32_t s0 = 0, s1 = 0, s2 = 0;
    for (int32_t k = 0; k < kN; ++k) {
        s0 += ext[3 * k];
        s1 += ext[3 * k + 1];
        s2 += ext[3 * k + 2];
    }
    const int32_t* trail = ext;
    const int32_t* lead = ext + 3 * kN;
    for (int32_t i = 0; i < count; ++i, trail += 3, lead += 3, out += 3) {
        out[0] = boxMean(s0);
        out[1] = boxMean(s1);
        out[2] = boxMean(s2);
        if (i + 1 < count) {
            s0 += lead[0] - trail[0];
            s1 += lead[1] - trail[1];
            s2 += lead[2] - trail[2];
        }
    }
}

// Host sample to the working scale: 8-bit << 8; 16-bit clamped to 32767, << 1.
template <class S>
inline int32_t toWork(S v);
template <>
inline int32_t toWork<uint8_t>(uint8_t v) {
    return int32_t(v) << 8;
}
template <>
inline int32_t toWork<uint16_t>(uint16_t v) {
    return int32_t(std::min<uint32_t>(v, 32767u) << 1);
}
template <class D>
inline D fromWork(int32_t v);  // v already in 0..65535
template <>
inline uint8_t fromWork<uint8_t>(int32_t v) {
    return uint8_t(v >> 8);
}
template <>
inline uint16_t fromWork<uint16_t>(int32_t v) {
    return uint16_t(v >> 1);
}

inline int32_t clamp16(int32_t v) { return v < 0 ? 0 : (v > 65535 ? 65535 : v); }

// Lab back to RGB in 32 bits: on this path L, a and b are box means and mixes of Lab values from
// host samples, so -1 <= a, b <= 65535 and 0 <= L <= 65535; a x 1365 stays below 2^27 and every sum
// below 2^18, exactly the 64-bit results.
inline void toRGB32(int32_t L, int32_t A, int32_t B, int32_t& r, int32_t& g, int32_t& b) {
    const int32_t p = (A * 1365) >> 10, q = (A * 682) >> 10;
    r = clamp16(L - 10922 + p - B);
    g = clamp16(L - 10922 + B - q);
    b = clamp16(L + 54612 - q - B);
}

struct cGeometry {
    int32_t W, H;       // stored size of the padded tile
    int32_t cx0, cx1, cy0, cy1;  // core, relative to the tile
    int32_t labX0, labX1, labY0, labY1;  // stored indices the Lab conversion covers (inclusive ranges as [0, 1))
};

template <class S>
struct cSource {
    const uint8_t* data;
    size_t rowBytes, pixelBytes;
    const S* at(int32_t x, int32_t y) const {
        return reinterpret_cast<const S*>(data + size_t(y) * rowBytes + size_t(x) * pixelBytes);
    }
};

template <class S, class D>
void runTile(const cPixelBlock& source, cPixelBlock& destination, KERNEL::cWorkerPool& pool, int32_t* rows,
             std::vector<std::vector<int32_t>>& lines) {
    cGeometry g{};
    const KERNEL::cRect P = source.outerRect, C = source.innerRect;
    g.W = P.x1 - P.x0;
    g.H = P.y1 - P.y0;
    g.cx0 = C.x0 - P.x0;
    g.cx1 = C.x1 - P.x0;
    g.cy0 = C.y0 - P.y0;
    g.cy1 = C.y1 - P.y0;
    // The Lab stage walks the core widened by its border; clamped positions repeat the edge.
    g.labX0 = clampIndex(int64_t(g.cx0) - kLabBorder, g.W);
    g.labX1 = clampIndex(int64_t(g.cx1) + kLabBorder - 1, g.W) + 1;
    g.labY0 = clampIndex(int64_t(g.cy0) - kLabBorder, g.H);
    g.labY1 = clampIndex(int64_t(g.cy1) + kLabBorder - 1, g.H) + 1;

    // The blur's frame is the core widened by step 2's border; the row passes run 6 further out
    // first, the column passes likewise.
    const int32_t fx0 = g.cx0 - kStep2Border, fx1 = g.cx1 + kStep2Border;
    const int32_t fy0 = g.cy0 - kStep2Border, fy1 = g.cy1 + kStep2Border;
    const cPass h2(fx0, fx1, g.W), h1(fx0 - kR, fx1 + kR, g.W);
    const cPass v2(fy0, fy1, g.H), v1(fy0 - kR, fy1 + kR, g.H);
    // Work back from the core to what each pass must deliver.
    const int32_t h2i0 = h2.from(g.cx0), h2i1 = h2.to(g.cx1);
    const int32_t h1i0 = h1.from(h2.readFrom(h2i0, h2i1)), h1i1 = h1.to(h2.readTo(h2i0, h2i1));
    const int32_t v2i0 = v2.from(g.cy0), v2i1 = v2.to(g.cy1);
    const int32_t v1i0 = v1.from(v2.readFrom(v2i0, v2i1)), v1i1 = v1.to(v2.readTo(v2i0, v2i1));
    const int32_t r0 = v1.readFrom(v1i0, v1i1), r1 = v1.readTo(v1i0, v1i1);
    if (h2i0 >= h2i1 || v2i0 >= v2i1 || h1i0 >= h1i1 || v1i0 >= v1i1 || r0 >= r1) return;

    const cSource<S> src{source.data, source.rowBytes, source.bytesPerPixel};
    const size_t rowStride = size_t(g.W) * 3;
    const bool h1Special = h1.special(h1i0, h1i1), h2Special = h2.special(h2i0, h2i1);
    const bool v1Special = v1.special(v1i0, v1i1), v2Special = v2.special(v2i0, v2i1);

    // Rows: host samples -> Lab (RGB outside the Lab stage's area, as the chain holds it there),
    // then both row passes.
    {
        KERNEL::timing::cStageClock clock(KERNEL::timing::kFastRows);
        pool.parallelFor(r1 - r0, [&](int part, int32_t b, int32_t e) {
            std::vector<int32_t>& buf = lines[size_t(part)];
            const size_t ext1 = size_t(h1i1 - h1i0 + 2 * kR), box1 = size_t(h1i1 - h1i0),
                         ext2 = size_t(h2i1 - h2i0 + 2 * kR);
            buf.resize(3 * (ext1 + box1 + ext2));
            int32_t* e1 = buf.data();
            int32_t* b1 = e1 + 3 * ext1;
            int32_t* e2 = b1 + 3 * box1;
            auto convert = [&](int32_t x, int32_t y, int32_t* o) {
                const S* p = src.at(x, y);
                const int32_t R = toWork<S>(p[0]), G = toWork<S>(p[1]), B = toWork<S>(p[2]);
                if (y >= g.labY0 && y < g.labY1 && x >= g.labX0 && x < g.labX1) {
                    KERNEL::lab::toLab(R, G, B, o[0], o[1], o[2]);
                } else {
                    o[0] = R;
                    o[1] = G;
                    o[2] = B;
                }
            };
            for (int32_t y = r0 + b; y < r0 + e; ++y) {
                // Gather the converted line with its clamped ends.
                const int32_t p0 = h1i0 - kR;
                for (size_t j = 0; j < ext1; ++j) convert(clampIndex(int64_t(p0) + int64_t(j), g.W), y, e1 + 3 * j);
                boxLine(e1, h1i1 - h1i0, b1);
                if (h1Special) {
                    int32_t s[3] = {0, 0, 0}, o[3];
                    for (int32_t k = -kR; k <= kR; ++k) {
                        convert(clampIndex(int64_t(h1.b) - 1 + k, g.W), y, o);
                        s[0] += o[0];
                        s[1] += o[1];
                        s[2] += o[2];
                    }
                    int32_t* last = b1 + 3 * size_t(h1.hi - 1 - h1i0);
                    for (int c = 0; c < 3; ++c) last[c] = boxMean(s[c]);
                }
                const int32_t q0 = h2i0 - kR;
                for (size_t j = 0; j < ext2; ++j) {
                    const int32_t idx = clampIndex(int64_t(q0) + int64_t(j), g.W) - h1i0;
                    std::memcpy(e2 + 3 * j, b1 + 3 * size_t(idx), 3 * sizeof(int32_t));
                }
                int32_t* out = rows + size_t(y) * rowStride + 3 * size_t(h2i0);
                boxLine(e2, h2i1 - h2i0, out);
                if (h2Special) {
                    int32_t s[3] = {0, 0, 0};
                    for (int32_t k = -kR; k <= kR; ++k) {
                        const int32_t* v = b1 + 3 * size_t(clampIndex(int64_t(h2.b) - 1 + k, g.W) - h1i0);
                        s[0] += v[0];
                        s[1] += v[1];
                        s[2] += v[2];
                    }
                    int32_t* last = rows + size_t(y) * rowStride + 3 * size_t(h2.hi - 1);
                    for (int c = 0; c < 3; ++c) last[c] = boxMean(s[c]);
                }
            }
        });
    }

    // Columns, in chunks: both column passes, the luminance mix, Lab back and the host's depth.
    KERNEL::timing::cStageClock clock(KERNEL::timing::kFastColumns);
    const int32_t columns = h2i1 - h2i0;
    const int32_t chunks = (columns + kColumnChunk - 1) / kColumnChunk;
    const int32_t fxMixA = fx0, fxMixB = fx1, fyMixA = fy0, fyMixB = fy1;
    pool.parallelFor(chunks, [&](int part, int32_t b, int32_t e) {
        std::vector<int32_t>& buf = lines[size_t(part)];
        const size_t K = 3 * size_t(kColumnChunk);
        const size_t v1Rows = size_t(v1i1 - v1i0);
        buf.resize(K * (v1Rows + 2 + size_t(kColumnChunk)));
        int32_t* col = buf.data();             // first pass, rows v1i0 .. v1i1
        int32_t* sums = col + K * v1Rows;      // running sums
        int32_t* tmp = sums + K;               // one output row
        for (int32_t chunk = b; chunk < e; ++chunk) {
            const int32_t x0 = h2i0 + chunk * kColumnChunk;
            const int32_t x1 = std::min(x0 + kColumnChunk, h2i1);
            const size_t n = 3 * size_t(x1 - x0);
            auto rowAt = [&](int64_t y) { return rows + size_t(clampIndex(y, g.H)) * rowStride + 3 * size_t(x0); };
            // First column pass: rows of the row passes -> col.
            std::fill(sums, sums + n, 0);
            for (int32_t k = -kR; k <= kR; ++k) {
                const int32_t* r = rowAt(int64_t(v1i0) + k);
                for (size_t c = 0; c < n; ++c) sums[c] += r[c];
            }
            for (int32_t i = v1i0; i < v1i1; ++i) {
                int32_t* o = col + K * size_t(i - v1i0);
                for (size_t c = 0; c < n; ++c) o[c] = boxMean(sums[c]);
                if (i + 1 < v1i1) {
                    const int32_t* lead = rowAt(int64_t(i) + kR + 1);
                    const int32_t* trail = rowAt(int64_t(i) - kR);
                    for (size_t c = 0; c < n; ++c) sums[c] += lead[c] - trail[c];
                }
            }
            if (v1Special) {
                std::fill(sums, sums + n, 0);
                for (int32_t k = -kR; k <= kR; ++k) {
                    const int32_t* r = rowAt(int64_t(v1.b) - 1 + k);
                    for (size_t c = 0; c < n; ++c) sums[c] += r[c];
                }
                int32_t* o = col + K * size_t(v1.hi - 1 - v1i0);
                for (size_t c = 0; c < n; ++c) o[c] = boxMean(sums[c]);
            }
            auto colAt = [&](int64_t y) { return col + K * size_t(clampIndex(y, g.H) - v1i0); };
            int64_t colMult[kColumnChunk];
            for (int32_t x = x0; x < x1; ++x) colMult[x - x0] = multiplicity(x, fxMixA, fxMixB, g.W);
            // Second column pass, row by row over the core, straight into the final pixels.
            std::fill(sums, sums + n, 0);
            for (int32_t k = -kR; k <= kR; ++k) {
                const int32_t* r = colAt(int64_t(v2i0) + k);
                for (size_t c = 0; c < n; ++c) sums[c] += r[c];
            }
            for (int32_t y = v2i0; y < v2i1; ++y) {
                const bool last = v2Special && y == v2.hi - 1;
                if (last) {
                    std::fill(tmp, tmp + n, 0);
                    for (int32_t k = -kR; k <= kR; ++k) {
                        const int32_t* r = colAt(int64_t(v2.b) - 1 + k);
                        for (size_t c = 0; c < n; ++c) tmp[c] += r[c];
                    }
                    for (size_t c = 0; c < n; ++c) tmp[c] = boxMean(tmp[c]);
                } else {
                    for (size_t c = 0; c < n; ++c) tmp[c] = boxMean(sums[c]);
                }
                if (y + 1 < v2i1) {
                    const int32_t* lead = colAt(int64_t(y) + kR + 1);
                    const int32_t* trail = colAt(int64_t(y) - kR);
                    for (size_t c = 0; c < n; ++c) sums[c] += lead[c] - trail[c];
                }
                // Mix: L = (blurred L + 2 x input L) / 3, once per frame position that clamps here.
                const int64_t rowMult = multiplicity(y, fyMixA, fyMixB, g.H);
                uint8_t* outRow = destination.data + size_t(y) * destination.rowBytes + size_t(x0) * destination.bytesPerPixel;
                const uint8_t* inRow = source.data + size_t(y) * source.rowBytes + size_t(x0) * source.bytesPerPixel;
                const size_t inStep = source.bytesPerPixel, outStep = destination.bytesPerPixel;
                for (int32_t x = x0; x < x1; ++x, inRow += inStep, outRow += outStep) {
                    const int32_t* t = tmp + 3 * size_t(x - x0);
                    const S* p = reinterpret_cast<const S*>(inRow);
                    const int32_t R0 = toWork<S>(p[0]), G0 = toWork<S>(p[1]), B0 = toWork<S>(p[2]);
                    // Input L: the Lab formula, which cannot leave 0..65535 for host samples.
                    const int32_t Ls = ((2 * R0 + 3 * G0 + B0) * 170) >> 10;
                    int32_t L = (t[0] + 2 * Ls) / 3;
                    const int64_t times = rowMult * colMult[size_t(x - x0)];
                    for (int64_t k = 1; k < times; ++k) {
                        const int32_t next = (L + 2 * Ls) / 3;
                        if (next == L) break;
                        L = next;
                    }
                    int32_t R, G, B;
                    toRGB32(L, t[1], t[2], R, G, B);
                    D* o = reinterpret_cast<D*>(outRow);
                    o[0] = fromWork<D>(R);
                    o[1] = fromWork<D>(G);
                    o[2] = fromWork<D>(B);
                }
            }
        }
    });
}

}  // namespace

bool cDefaultChainTile::Accepts(const cPixelBlock& s, const cPixelBlock& d) {
    const bool rgb8 = s.mode == KERNEL::kModeRGB && s.bytesPerSample == 1;
    const bool rgb16 = s.mode == KERNEL::kModeRGB16 && s.bytesPerSample == 2;
    if (!(rgb8 || rgb16) || d.mode != s.mode || d.bytesPerSample != s.bytesPerSample) return false;
    if (s.sampling != 1 || d.sampling != 1 || s.data == nullptr || d.data == nullptr) return false;
    if (s.bytesPerPixel < 3 * s.bytesPerSample || d.bytesPerPixel < 3 * d.bytesPerSample) return false;
    if (!(s.outerRect == d.outerRect) || !(s.innerRect == d.innerRect)) return false;
    const KERNEL::cRect& o = s.outerRect;
    const KERNEL::cRect& i = s.innerRect;
    return o.x1 > o.x0 && o.y1 > o.y0 && i.x0 >= o.x0 && i.x1 <= o.x1 && i.y0 >= o.y0 && i.y1 <= o.y1 &&
           i.x1 > i.x0 && i.y1 > i.y0;
}

void cDefaultChainTile::Run(const cPixelBlock& source, cPixelBlock& destination, KERNEL::cWorkerPool& pool) {
    if (lines.size() < size_t(pool.Threads())) lines.resize(size_t(pool.Threads()));
    const uint64_t bytes = uint64_t(source.outerRect.width()) * uint64_t(source.outerRect.height()) * 3 * sizeof(int32_t);
    if (!rowsMemory || rowsMemory->Size() < bytes) {
        rows = nullptr;
        rowsMemory.reset();
        if (bytes > UINT32_MAX) throw KERNEL::cMEMException("could not allocate mem handle", 18, "kernel/Memory");
        auto memory = std::make_unique<KERNEL::cMEM>(uint32_t(bytes));
        rows = static_cast<int32_t*>(memory->Lock());
        rowsMemory = std::move(memory);
    }
    if (source.bytesPerSample == 1)
        runTile<uint8_t, uint8_t>(source, destination, pool, rows, lines);
    else
        runTile<uint16_t, uint16_t>(source, destination, pool, rows, lines);
}
