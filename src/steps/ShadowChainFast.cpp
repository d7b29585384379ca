#include "steps/ShadowChainFast.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <optional>
#include <stdexcept>
#include <type_traits>

#if defined(__x86_64__)
#include <immintrin.h>
#endif

#include "kernel/Lab.h"
#include "kernel/PixelBlock.h"
#include "kernel/StageTimer.h"
#include "kernel/WorkerPool.h"

using KERNEL::cPixelBlock;

// Row kernels get an AVX2 clone chosen at load time. Clang cannot clone templates; there they
// stay baseline.
#if defined(__GNUC__) && !defined(__clang__) && !defined(_WIN32)
#define NOCTIVA_AVX2_CLONES __attribute__((target_clones("avx2", "default")))
#else
#define NOCTIVA_AVX2_CLONES
#endif

namespace {

// blur(6.0): a 13-pixel box, twice along each axis; step 2 asks for 20 pixels around the core and
// the Lab conversion for 30.
constexpr int32_t kR = 6;
constexpr int32_t kN = 2 * kR + 1;
constexpr int32_t kStep2Border = 20;
constexpr int32_t kLabBorder = 30;
// Values per vertical sweep (a row holds three per pixel): the scratch stays in L1/L2. Several
// threads take half as many, so that a tile has a dozen chunks to share evenly; each chunk costs
// its own start-up sums.
constexpr int32_t kChunkValues = 96;
constexpr int32_t kPrefetchRows = 4;
constexpr int32_t kSharedChunkValues = 48;

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

constexpr float kBoxScale = 1.0f / float(kN);
inline int32_t boxMean(int32_t sum) { return int32_t(float(sum) * kBoxScale); }

// Box means along one channel's line: ext holds positions i0 - kR .. i0 + count - 1 + kR (already
// clamped), out receives `count` means. Each sum is taken afresh from its 13 taps: the taps are
// exact integers, so this equals a running sum, and it has no serial dependency.
template <class T>
inline void boxLineT(const int32_t* __restrict ext, int32_t count, T* __restrict out) {
    for (int32_t j = 0; j < count; ++j) {
        int32_t s = 0;
        for (int32_t k = 0; k < kN; ++k) s += ext[j + k];
        out[j] = T(boxMean(s));
    }
}
NOCTIVA_AVX2_CLONES void boxLine(const int32_t* ext, int32_t count, int32_t* out) {
    boxLineT(ext, count, out);
}
// Input L of a Lab line's pixels [0, n).
NOCTIVA_AVX2_CLONES void takeL(const int32_t* L, int32_t n, uint16_t* out) {
    for (int32_t i = 0; i < n; ++i) out[i] = uint16_t(L[i]);
}
// Means of host samples' Lab or RGB values lie in 0..65535 (a and b of host samples cannot reach
// -1), so the tile's row-pass and column-pass results are kept in 16 bits: half the cache.
NOCTIVA_AVX2_CLONES void boxLine(const int32_t* ext, int32_t count, uint16_t* out) {
    boxLineT(ext, count, out);
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

// Lab of host samples in 32 bits: 6 x 65535 x 170 < 2^27, and L cannot leave 0..65279.
inline void toLab32(int32_t r, int32_t g, int32_t b, int32_t& L, int32_t& A, int32_t& B) {
    L = ((2 * r + 3 * g + b) * 170) >> 10;
    A = ((r - b) >> 1) + 32767;
    B = ((g - b) >> 1) + 32767;
}

// Lab back to RGB in 32 bits: on this path L, a and b are box means and mixes of Lab values from
// host samples, so -1 <= a, b <= 65535 and 0 <= L <= 65535; a x 1365 stays below 2^27 and every sum
// below 2^18, exactly the 64-bit results.
inline void toRGB32(int32_t L, int32_t A, int32_t B, int32_t& r, int32_t& g, int32_t& b) {
    const int32_t p = (A * 1365) >> 10, q = (A * 682) >> 10;
    r = clamp16(L - 10922 + p - B);
    g = clamp16(L - 10922 + B - q);
    b = clamp16(L + 54612 - q - B);
}

// Lines are planar: a channel's values for every position, then the next channel's, `plane`
// apart. Planar lines make every pass but the host conversions a run over contiguous values.
//
// Host pixels [0, n) of one row to the working scale, as Lab or as RGB. CH is the pixel's sample
// count when known at compile time (3, 4), else 0 and `ch` gives it.
template <class S, int CH, bool LAB>
inline void convertSpan(const S* __restrict in, int32_t ch, int32_t n, int32_t* __restrict out, size_t plane) {
    const int32_t step = CH != 0 ? CH : ch;
    int32_t* __restrict o0 = out;
    int32_t* __restrict o1 = out + plane;
    int32_t* __restrict o2 = out + 2 * plane;
    for (int32_t i = 0; i < n; ++i) {
        const S* p = in + size_t(i) * size_t(step);
        const int32_t R = toWork<S>(p[0]), G = toWork<S>(p[1]), B = toWork<S>(p[2]);
        if constexpr (LAB) {
            toLab32(R, G, B, o0[i], o1[i], o2[i]);
        } else {
            o0[i] = R;
            o1[i] = G;
            o2[i] = B;
        }
    }
}

// The mix for `n` pixels of one core row, each taken once: L = (blurred L + 2 x input L) / 3, then
// Lab back and the host's depth. `input` holds the input L the row phase computed. The alpha
// sample, if any, is left as it is.
template <class S, int CH>
inline void mixSpan(const uint16_t* __restrict input, const uint16_t* __restrict blur, size_t plane, int32_t ch,
                    int32_t n, S* __restrict out) {
    const int32_t step = CH != 0 ? CH : ch;
    const uint16_t* __restrict bL = blur;
    const uint16_t* __restrict bA = blur + plane;
    const uint16_t* __restrict bB = blur + 2 * plane;
    for (int32_t i = 0; i < n; ++i) {
        // Both terms are >= 0: the unsigned division is the signed one and vectorises.
        const int32_t L = int32_t(uint32_t(bL[i] + 2 * int32_t(input[i])) / 3u);
        int32_t R, G, B;
        toRGB32(L, bA[i], bB[i], R, G, B);
        S* o = out + size_t(i) * size_t(step);
        o[0] = fromWork<S>(R);
        o[1] = fromWork<S>(G);
        o[2] = fromWork<S>(B);
    }
}

// One pixel whose frame position is taken `times` times (clamped edges): the mix repeats.
template <class S>
inline void mixPixel(const S* p, const uint16_t* t, size_t plane, int64_t times, S* o) {
    const int32_t R0 = toWork<S>(p[0]), G0 = toWork<S>(p[1]), B0 = toWork<S>(p[2]);
    const int32_t Ls = ((2 * R0 + 3 * G0 + B0) * 170) >> 10;
    int32_t L = (t[0] + 2 * Ls) / 3;
    for (int64_t k = 1; k < times; ++k) {
        const int32_t next = (L + 2 * Ls) / 3;
        if (next == L) break;
        L = next;
    }
    int32_t R, G, B;
    toRGB32(L, t[plane], t[2 * plane], R, G, B);
    o[0] = fromWork<S>(R);
    o[1] = fromWork<S>(G);
    o[2] = fromWork<S>(B);
}

// Row kernels for one sample type and pixel layout, compiled for AVX2 and for the baseline.
template <class S, int CH>
struct cKernels {
    NOCTIVA_AVX2_CLONES static void convertRgb(const S* in, int32_t ch, int32_t n, int32_t* out, size_t plane) {
        convertSpan<S, CH, false>(in, ch, n, out, plane);
    }
    NOCTIVA_AVX2_CLONES static void convertLab(const S* in, int32_t ch, int32_t n, int32_t* out, size_t plane) {
        convertSpan<S, CH, true>(in, ch, n, out, plane);
    }
    NOCTIVA_AVX2_CLONES static void mix(const uint16_t* in, const uint16_t* blur, size_t plane, int32_t ch,
                                        int32_t n, S* out) {
        mixSpan<S, CH>(in, blur, plane, ch, n, out);
    }
};

#if defined(__x86_64__) && (defined(__GNUC__) || defined(__clang__))
// The mix for RGB, eight pixels at a time: the compiler cannot interleave the three planes into
// pixels without a long chain of shuffles. Same arithmetic as mixSpan: L / 3 by the multiply-high
// of 0xAAAAAAAB (exact for every 32-bit L), the rest as written there.
__attribute__((target("avx2"))) inline __m256i load8(const uint16_t* p) {
    return _mm256_cvtepu16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p)));
}
__attribute__((target("avx2"))) inline __m256i clamp16x8(__m256i v) {
    return _mm256_min_epi32(_mm256_max_epi32(v, _mm256_setzero_si256()), _mm256_set1_epi32(65535));
}
// The block's pixels leave as 12-byte pieces: 2 for 8-bit samples, 4 for 16-bit.
template <class S>
constexpr int kPieces = sizeof(S) == 1 ? 2 : 4;
constexpr int kPieceBytes = 12;

// Eight pixels from `i`, in the host's depth, as kPieces<S> pieces (each in a vector's first 12 bytes).
template <class S>
__attribute__((target("avx2"))) inline void mixBlock(const uint16_t* input, const uint16_t* bL, const uint16_t* bA,
                                                     const uint16_t* bB, int32_t i, __m128i* piece) {
    const __m256i magic = _mm256_set1_epi32(int32_t(0xAAAAAAABu));
    const __m256i x = _mm256_add_epi32(load8(bL + i), _mm256_slli_epi32(load8(input + i), 1));
    const __m256i even = _mm256_srli_epi64(_mm256_mul_epu32(x, magic), 33);
    const __m256i odd = _mm256_slli_epi64(_mm256_srli_epi64(_mm256_mul_epu32(_mm256_srli_epi64(x, 32), magic), 33), 32);
    const __m256i L = _mm256_or_si256(even, odd);
    const __m256i A = load8(bA + i), B = load8(bB + i);
    const __m256i p = _mm256_srai_epi32(_mm256_mullo_epi32(A, _mm256_set1_epi32(1365)), 10);
    const __m256i q = _mm256_srai_epi32(_mm256_mullo_epi32(A, _mm256_set1_epi32(682)), 10);
    const __m256i Lm = _mm256_sub_epi32(L, _mm256_set1_epi32(10922));
    __m256i r = clamp16x8(_mm256_sub_epi32(_mm256_add_epi32(Lm, p), B));
    __m256i g = clamp16x8(_mm256_sub_epi32(_mm256_add_epi32(Lm, B), q));
    __m256i b = clamp16x8(_mm256_sub_epi32(_mm256_sub_epi32(_mm256_add_epi32(L, _mm256_set1_epi32(54612)), q), B));
    if constexpr (sizeof(S) == 1) {
        r = _mm256_srli_epi32(r, 8);
        g = _mm256_srli_epi32(g, 8);
        b = _mm256_srli_epi32(b, 8);
        const __m256i px = _mm256_or_si256(r, _mm256_or_si256(_mm256_slli_epi32(g, 8), _mm256_slli_epi32(b, 16)));
        // Per 128-bit lane: bytes 0..2 of each 32-bit pixel.
        const __m256i pack = _mm256_setr_epi8(0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, -1, -1, -1, -1,  //
                                              0, 1, 2, 4, 5, 6, 8, 9, 10, 12, 13, 14, -1, -1, -1, -1);
        const __m256i packed = _mm256_shuffle_epi8(px, pack);
        piece[0] = _mm256_castsi256_si128(packed);
        piece[1] = _mm256_extracti128_si256(packed, 1);
    } else {
        r = _mm256_srli_epi32(r, 1);
        g = _mm256_srli_epi32(g, 1);
        b = _mm256_srli_epi32(b, 1);
        // Per lane: (r g) (b 0) pairs of two pixels, then the zero sample dropped.
        const __m256i rg = _mm256_or_si256(r, _mm256_slli_epi32(g, 16));
        const __m256i pack = _mm256_setr_epi8(0, 1, 2, 3, 4, 5, 8, 9, 10, 11, 12, 13, -1, -1, -1, -1,  //
                                              0, 1, 2, 3, 4, 5, 8, 9, 10, 11, 12, 13, -1, -1, -1, -1);
        const __m256i lo = _mm256_shuffle_epi8(_mm256_unpacklo_epi32(rg, b), pack);  // pixels 0 1 | 4 5
        const __m256i hi = _mm256_shuffle_epi8(_mm256_unpackhi_epi32(rg, b), pack);  // pixels 2 3 | 6 7
        piece[0] = _mm256_castsi256_si128(lo);
        piece[1] = _mm256_castsi256_si128(hi);
        piece[2] = _mm256_extracti128_si256(lo, 1);
        piece[3] = _mm256_extracti128_si256(hi, 1);
    }
}

template <class S>
__attribute__((target("avx2"))) void mixRgbAvx2(const uint16_t* __restrict input, const uint16_t* __restrict blur,
                                                size_t plane, int32_t n, S* __restrict out) {
    if (n < 8) {
        mixSpan<S, 3>(input, blur, plane, 3, n, out);
        return;
    }
    const uint16_t* bL = blur;
    const uint16_t* bA = blur + plane;
    const uint16_t* bB = blur + 2 * plane;
    constexpr size_t kPixel = 3 * sizeof(S);
    uint8_t* const o = reinterpret_cast<uint8_t*>(out);
    __m128i piece[kPieces<S>];
    int32_t i = 0;
    // Each piece is stored as 16 bytes: all but the last block have room for the 4 extra.
    for (; i + 10 <= n; i += 8) {
        mixBlock<S>(input, bL, bA, bB, i, piece);
        for (int k = 0; k < kPieces<S>; ++k)
            _mm_storeu_si128(reinterpret_cast<__m128i*>(o + kPixel * size_t(i) + size_t(kPieceBytes * k)), piece[k]);
    }
    // The last 0 to 9 pixels: whole blocks through a buffer, the last one ending at n.
    while (i < n) {
        const int32_t from = std::min(i, n - 8);
        mixBlock<S>(input, bL, bA, bB, from, piece);
        alignas(16) uint8_t bytes[kPieceBytes * kPieces<S> + 4];
        for (int k = 0; k < kPieces<S>; ++k)
            _mm_storeu_si128(reinterpret_cast<__m128i*>(bytes + kPieceBytes * k), piece[k]);
        const int32_t end = from + 8;
        std::memcpy(o + kPixel * size_t(i), bytes + kPixel * size_t(i - from), kPixel * size_t(end - i));
        i = end;
    }
}

template <class S>
void mixRgb(const uint16_t* in, const uint16_t* blur, size_t plane, int32_t n, S* out) {
    static const bool avx2 = __builtin_cpu_supports("avx2");
    if (avx2)
        mixRgbAvx2<S>(in, blur, plane, n, out);
    else
        mixSpan<S, 3>(in, blur, plane, 3, n, out);
}
template <>
void cKernels<uint8_t, 3>::mix(const uint16_t* in, const uint16_t* blur, size_t plane, int32_t, int32_t n,
                               uint8_t* out) {
    mixRgb(in, blur, plane, n, out);
}
template <>
void cKernels<uint16_t, 3>::mix(const uint16_t* in, const uint16_t* blur, size_t plane, int32_t, int32_t n,
                                uint16_t* out) {
    mixRgb(in, blur, plane, n, out);
}
#endif

// What the column passes need to know about a tile.
struct cColumns {
    uint16_t* rows;
    size_t rowStride;
    int32_t H;
    int32_t v1i0, v1i1, v2i0, v2i1;
    const cPass* v1;
    const cPass* v2;
    bool v1Special, v2Special;
};

// Both column passes over the values [x0, x0 + n) of every row of `rows` (any channel: each value
// is its own column); the result replaces those values in the core rows, which no other chunk
// reads. NW is n when fixed at compile time, else 0.
template <size_t NW>
NOCTIVA_AVX2_CLONES void columnChunk(const cColumns& t, int32_t x0, size_t nRun, int32_t* scratch) {
    const size_t n = NW != 0 ? NW : nRun;
    constexpr size_t K3 = size_t(kChunkValues);
    int32_t* __restrict col = scratch;                                   // first pass, rows v1i0 .. v1i1
    int32_t* __restrict sums = scratch + K3 * size_t(t.v1i1 - t.v1i0);  // running sums
    uint16_t* const rows = t.rows;
    auto rowAt = [&](int64_t y) -> const uint16_t* {
        return rows + size_t(clampIndex(y, t.H)) * t.rowStride + size_t(x0);
    };
    auto colAt = [&](int64_t y) -> const int32_t* { return col + K3 * size_t(clampIndex(y, t.H) - t.v1i0); };
    auto sumAround = [&](auto at, int64_t centre) {
        for (size_t c = 0; c < n; ++c) sums[c] = 0;
        for (int32_t k = -kR; k <= kR; ++k) {
            const auto* r = at(centre + k);
            for (size_t c = 0; c < n; ++c) sums[c] += r[c];
        }
    };
    // First column pass: rows of the row passes -> col.
    sumAround(rowAt, t.v1i0);
    for (int32_t i = t.v1i0;; ++i) {
        int32_t* o = col + K3 * size_t(i - t.v1i0);
        if (i + 1 == t.v1i1) {
            for (size_t c = 0; c < n; ++c) o[c] = boxMean(sums[c]);
            break;
        }
        const uint16_t* lead = rowAt(int64_t(i) + kR + 1);
        const uint16_t* trail = rowAt(int64_t(i) - kR);
        for (size_t c = 0; c < n; ++c) {
            o[c] = boxMean(sums[c]);
            sums[c] += lead[c] - trail[c];
        }
    }
    if (t.v1Special) {
        sumAround(rowAt, int64_t(t.v1->b) - 1);
        int32_t* o = col + K3 * size_t(t.v1->hi - 1 - t.v1i0);
        for (size_t c = 0; c < n; ++c) o[c] = boxMean(sums[c]);
    }
    // Second column pass over the core rows, back into `rows`.
    const int32_t special = t.v2Special ? t.v2->hi - 1 : -1;
    sumAround(colAt, t.v2i0);
    for (int32_t y = t.v2i0; y < t.v2i1; ++y) {
        uint16_t* __restrict o = rows + size_t(y) * t.rowStride + size_t(x0);
        if (y == special) {
            int32_t last[K3];
            for (size_t c = 0; c < n; ++c) last[c] = 0;
            for (int32_t k = -kR; k <= kR; ++k) {
                const int32_t* r = colAt(int64_t(t.v2->b) - 1 + k);
                for (size_t c = 0; c < n; ++c) last[c] += r[c];
            }
            for (size_t c = 0; c < n; ++c) o[c] = uint16_t(boxMean(last[c]));
        } else {
            for (size_t c = 0; c < n; ++c) o[c] = uint16_t(boxMean(sums[c]));
        }
        if (y + 1 == t.v2i1) break;
        const int32_t* lead = colAt(int64_t(y) + kR + 1);
        const int32_t* trail = colAt(int64_t(y) - kR);
        for (size_t c = 0; c < n; ++c) sums[c] += lead[c] - trail[c];
    }
}

// Scratch shared by the phases of every tile: it only grows, so no tile pays for clearing it.
inline void grow(std::vector<int32_t>& v, size_t n) {
    if (v.size() < n) v.resize(n);
}

struct cGeometry {
    int32_t W, H;       // stored size of the padded tile
    int32_t cx0, cx1, cy0, cy1;  // core, relative to the tile
    int32_t labX0, labX1, labY0, labY1;  // stored indices the Lab conversion covers (inclusive ranges as [0, 1))
};

template <class S, int CH>
void runTile(const cPixelBlock& source, cPixelBlock& destination, KERNEL::cWorkerPool& pool, uint16_t* rows,
             std::vector<std::vector<int32_t>>& lines) {
    using K = cKernels<S, CH>;
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

    const int32_t ch = int32_t(source.bytesPerPixel / sizeof(S));
    // `rows` holds the core's columns, row by row over the whole tile height, each row planar.
    const size_t rowPlane = size_t(h2i1 - h2i0), rowStride = 3 * rowPlane;
    uint16_t* const inputL = rows + rowStride * size_t(g.H);  // core rows by core columns
    const bool h1Special = h1.special(h1i0, h1i1), h2Special = h2.special(h2i0, h2i1);
    const bool v1Special = v1.special(v1i0, v1i1), v2Special = v2.special(v2i0, v2i1);

    // Rows: host samples -> Lab (RGB outside the Lab stage's area, as the chain holds it there),
    // then both row passes. Each line is laid out by position, clamped positions hold copies of
    // the edge pixel, so the passes run over plain arrays.
    // Line 1: positions [p0, p1); its stored part [s0, s1).
    const int32_t p0 = h1i0 - kR, p1 = h1i1 + kR;
    const int32_t s0 = std::max(p0, 0), s1 = std::min(p1, g.W);
    // Line 2: positions [q0, q1); pass 1 writes stored index s at s - q0.
    const int32_t q0 = h2i0 - kR, q1 = h2i1 + kR;
    const size_t ext1 = size_t(p1 - p0), ext2 = size_t(std::max(q1, h1i1) - q0);
    auto rowsPart = [&](int part, int32_t b, int32_t e) {
        std::vector<int32_t>& buf = lines[size_t(part)];
        grow(buf, 3 * (ext1 + ext2));
        int32_t* e1 = buf.data();
        int32_t* e2 = e1 + 3 * ext1;
        auto replicate = [](int32_t* line, size_t plane, int32_t first, int32_t last, int32_t from) {
            for (int c = 0; c < 3; ++c, line += plane)
                for (int32_t j = first; j < last; ++j) line[j] = line[from];
        };
        // The box pass over every channel, and the position the clamped write gives to the pass's
        // last position (`special`), at `at` of the output.
        auto pass = [](const int32_t* in, size_t inPlane, int32_t count, auto* out, size_t outPlane) {
            for (int c = 0; c < 3; ++c) boxLine(in + size_t(c) * inPlane, count, out + size_t(c) * outPlane);
        };
        auto lastPosition = [&](const int32_t* in, size_t inPlane, int32_t inFirst, const cPass& h, auto* out,
                                size_t outPlane, size_t at) {
            for (int c = 0; c < 3; ++c) {
                int32_t sum = 0;
                for (int32_t k = -kR; k <= kR; ++k)
                    sum += in[size_t(c) * inPlane + size_t(clampIndex(int64_t(h.b) - 1 + k, g.W) - inFirst)];
                out[size_t(c) * outPlane + at] = std::remove_reference_t<decltype(*out)>(boxMean(sum));
            }
        };
        for (int32_t y = r0 + b; y < r0 + e; ++y) {
            const S* in = reinterpret_cast<const S*>(source.data + size_t(y) * source.rowBytes);
            // The host's rows may lie far apart in its image: ask for a later row's span early.
            if (y + kPrefetchRows < r1) {
                const uint8_t* ahead = source.data + size_t(y + kPrefetchRows) * source.rowBytes + size_t(s0) * source.bytesPerPixel;
                const size_t span = size_t(s1 - s0) * source.bytesPerPixel;
                for (size_t off = 0; off < span; off += 64) __builtin_prefetch(ahead + off);
            }
            auto convert = [&](int32_t x0, int32_t x1, bool lab) {
                if (x0 >= x1) return;
                const S* at = in + size_t(x0) * size_t(ch);
                int32_t* out = e1 + size_t(x0 - p0);
                if (lab)
                    K::convertLab(at, ch, x1 - x0, out, ext1);
                else
                    K::convertRgb(at, ch, x1 - x0, out, ext1);
            };
            if (y >= g.labY0 && y < g.labY1) {
                convert(s0, std::min(s1, g.labX0), false);
                convert(std::max(s0, g.labX0), std::min(s1, g.labX1), true);
                convert(std::max(s0, g.labX1), s1, false);
            } else {
                convert(s0, s1, false);
            }
            replicate(e1, ext1, 0, s0 - p0, s0 - p0);
            replicate(e1, ext1, s1 - p0, p1 - p0, s1 - 1 - p0);
            // The core lies inside the Lab stage's area: keep its input L for the mix.
            if (y >= v2i0 && y < v2i1)
                takeL(e1 + size_t(h2i0 - p0), h2i1 - h2i0, inputL + size_t(y - v2i0) * rowPlane);

            int32_t* b1 = e2 + size_t(h1i0 - q0);
            pass(e1, ext1, h1i1 - h1i0, b1, ext2);
            if (h1Special) lastPosition(e1, ext1, p0, h1, b1, ext2, size_t(h1.hi - 1 - h1i0));
            // Line 2's clamped positions: stored 0 before, stored W - 1 after.
            replicate(e2, ext2, 0, std::max(0, -q0), -q0);
            replicate(e2, ext2, std::max(0, g.W - q0), q1 - q0, g.W - 1 - q0);

            uint16_t* out = rows + size_t(y) * rowStride;
            pass(e2, ext2, h2i1 - h2i0, out, rowPlane);
            if (h2Special) lastPosition(e2, ext2, q0, h2, out, rowPlane, size_t(h2.hi - 1 - h2i0));
        }
    };

    // Columns, in chunks of a row's values: both column passes; the result replaces the chunk's own
    // values of the core rows in `rows`, which no other chunk reads.
    const int32_t values = int32_t(rowStride);
    const int32_t chunkValues = pool.Threads() > 1 ? kSharedChunkValues : kChunkValues;
    const int32_t chunks = (values + chunkValues - 1) / chunkValues;
    const cColumns cv{rows, rowStride, g.H, v1i0, v1i1, v2i0, v2i1, &v1, &v2, v1Special, v2Special};
    auto columnsPart = [&](int part, int32_t b, int32_t e) {
        std::vector<int32_t>& buf = lines[size_t(part)];
        grow(buf, size_t(kChunkValues) * size_t(v1i1 - v1i0 + 1));
        for (int32_t chunk = b; chunk < e; ++chunk) {
            const int32_t x0 = chunk * chunkValues;
            const int32_t x1 = std::min(x0 + chunkValues, values);
            if (x1 - x0 == kChunkValues)
                columnChunk<kChunkValues>(cv, x0, 0, buf.data());
            else if (x1 - x0 == kSharedChunkValues)
                columnChunk<kSharedChunkValues>(cv, x0, 0, buf.data());
            else
                columnChunk<0>(cv, x0, size_t(x1 - x0), buf.data());
        }
    };

    // Mix, Lab back and the host's depth over whole core rows. A frame position clamped onto a
    // stored edge pixel is mixed once per position: those few pixels are redone afterwards.
    const int64_t colMultFirst = multiplicity(h2i0, fx0, fx1, g.W), colMultLast = multiplicity(h2i1 - 1, fx0, fx1, g.W);
    auto mixPart = [&](int, int32_t b, int32_t e) {
        for (int32_t y = v2i0 + b; y < v2i0 + e; ++y) {
            const S* in = reinterpret_cast<const S*>(source.data + size_t(y) * source.rowBytes) + size_t(h2i0) * size_t(ch);
            S* out = reinterpret_cast<S*>(destination.data + size_t(y) * destination.rowBytes) + size_t(h2i0) * size_t(ch);
            const uint16_t* blur = rows + size_t(y) * rowStride;
            const int32_t n = h2i1 - h2i0;
            const int64_t rowMult = multiplicity(y, fy0, fy1, g.H);
            if (rowMult == 1) {
                // Edge pixels with another multiplicity go through the scalar mix, never both (the
                // source and destination may be one buffer).
                const int32_t a = colMultFirst != 1 ? 1 : 0, z = n > 1 && colMultLast != 1 ? n - 1 : n;
                const uint16_t* ls = inputL + size_t(y - v2i0) * size_t(n);
                if (z > a) K::mix(ls + a, blur + size_t(a), rowPlane, ch, z - a, out + size_t(a) * size_t(ch));
                if (a == 1) mixPixel<S>(in, blur, rowPlane, colMultFirst, out);
                if (z == n - 1)
                    mixPixel<S>(in + size_t(z) * size_t(ch), blur + size_t(z), rowPlane, colMultLast,
                                out + size_t(z) * size_t(ch));
            } else {
                for (int32_t x = h2i0; x < h2i1; ++x) {
                    const size_t i = size_t(x - h2i0);
                    mixPixel<S>(in + i * size_t(ch), blur + i, rowPlane, rowMult * multiplicity(x, fx0, fx1, g.W),
                                out + i * size_t(ch));
                }
            }
        }
    };

    // One section per tile: each phase waits for the previous one's last grain; the calling thread
    // (part 0) times them.
    pool.parallelSection([&](KERNEL::cWorkerPool::cSection& s) {
        auto phase = [&](KERNEL::timing::Stage stage, int32_t count, int32_t grain, const auto& body, bool last) {
            std::optional<KERNEL::timing::cStageClock> clock;
            if (s.part == 0) clock.emplace(stage);
            s.phase(count, grain, body, !last);
        };
        phase(KERNEL::timing::kFastRows, r1 - r0, 8, rowsPart, false);
        phase(KERNEL::timing::kFastColumns, chunks, 1, columnsPart, false);
        phase(KERNEL::timing::kFastMix, v2i1 - v2i0, 8, mixPart, true);
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
    // Row-pass results (3 per pixel) and the core's input L (1 per pixel), at most the tile.
    const uint64_t bytes = uint64_t(source.outerRect.width()) * uint64_t(source.outerRect.height()) * 4 * sizeof(uint16_t);
    if (!rowsMemory || rowsMemory->Size() < bytes) {
        rows = nullptr;
        rowsMemory.reset();
        if (bytes > UINT32_MAX) throw KERNEL::cMEMException("could not allocate mem handle", 18, "kernel/Memory");
        auto memory = std::make_unique<KERNEL::cMEM>(uint32_t(bytes));
        rows = static_cast<uint16_t*>(memory->Lock());
        rowsMemory = std::move(memory);
    }
    const size_t channels = source.bytesPerPixel / source.bytesPerSample;
    const bool whole = source.bytesPerPixel % source.bytesPerSample == 0 && source.rowBytes % source.bytesPerSample == 0 &&
                       destination.bytesPerPixel == source.bytesPerPixel &&
                       destination.rowBytes % destination.bytesPerSample == 0;
    if (!whole) throw std::logic_error("default chain tile: pixel layout not in whole samples");
    if (source.bytesPerSample == 1) {
        if (channels == 3)
            runTile<uint8_t, 3>(source, destination, pool, rows, lines);
        else if (channels == 4)
            runTile<uint8_t, 4>(source, destination, pool, rows, lines);
        else
            runTile<uint8_t, 0>(source, destination, pool, rows, lines);
    } else {
        if (channels == 3)
            runTile<uint16_t, 3>(source, destination, pool, rows, lines);
        else if (channels == 4)
            runTile<uint16_t, 4>(source, destination, pool, rows, lines);
        else
            runTile<uint16_t, 0>(source, destination, pool, rows, lines);
    }
}
