// SPDX-License-Identifier: Apache-2.0
// The sums of a linear filter: how a block of neighbouring elements takes one tap. A tap is the smallest piece of a
// kernel row that has one coefficient word: one pixel, or a pair of pixels where integers are multiplied two at a time.
//
// Taps offers    Source, Coefficient            element types of the image and of the packed kernel
//                Sum                            a vector of sums; a block has two
//                Total                          what Finish takes two of for a block: Sum, or WideSum for InGroups
//                Partial                        TwoVectors: a block of sources, or of sums while they are made
//                block                          elements of a block
//                pixels                         pixels of a tap
//                repeats                        copies of a coefficient in the packed kernel, one after the other
//                overread                       elements that Free may read behind the last pixel of a block's window
//                bandRows, bandBlocks           rows and blocks that are summed at once, as the registers allow
//                unrolls                        whether common kernel widths have code of their own
//                Free                           loads blocks whole: vector(p, i), the i-th vector from block p on, or,
//                                               where a block's vectors are made together, (p, ..., block)
//                loadExactly(p, second, n, v)   the first n elements of a block and nothing else; second is null where
//                                               the tap is the single last pixel of an odd row
//                begin, add, end                sums from their start, vector by vector, to what Finish takes
#pragma once
#include "kernels/pack_convert.h"

namespace qori::kernels {

#if defined(__i386__)
inline constexpr bool kFewRegisters = true;
#else
inline constexpr bool kFewRegisters = false;
#endif

/// Sums of integers may be added in any order, and a compiler that looks for another one runs out of registers.
QORI_INLINE void keepOrder(__m256i& sum) { __asm__("" : "+x"(sum)); }

/// Two vectors: of sources, or of sums.
template <class T>
struct TwoVectors {
    using Total = Vec<T>;
    Vec<T> v[2];

    static QORI_INLINE void begin(TwoVectors& sums, Vec<T> start) { sums.v[0] = sums.v[1] = start; }
    static QORI_INLINE void end(const TwoVectors& sums, Vec<T> (&out)[2]) {
        out[0] = sums.v[0];
        out[1] = sums.v[1];
    }
};

/// Integers in pairs of neighbouring pixels: a 32-bit lane holds both as 16 bits, and one multiply-add of 16-bit words
/// adds both products. A pair of products can leave 32 bits only where all four factors are -32768; it then wraps to
/// -2^31, and every addition wraps too, so that a lane always is the sum modulo 2^32. Unsigned 16-bit pixels are taken
/// less 32768, which a sum that starts at 32768 times the sum of the kernel makes good.
///
/// The lanes of a block's two vectors are the elements 0-3, 8-11 and 4-7, 12-15, as unpacking leaves them and packing
/// wants them.
template <class S>
struct PairTaps : TwoVectors<int32_t> {
    using Source = S;
    using Coefficient = int32_t;  ///< The first pixel's in the low half.
    using Sum = Vec<int32_t>;
    using Partial = TwoVectors<int32_t>;
    static constexpr int block = 16, pixels = 2, repeats = 4;
    static constexpr int bandRows = kFewRegisters ? 2 : 4, bandBlocks = 1;
    static constexpr bool unrolls = sizeof(S) == 1 || std::is_signed_v<S>;
    /// Bytes take 20 from p on; the pair that ends an odd row takes one pixel, of at most 4 elements, too many.
    static constexpr int overread = 4;

    static QORI_INLINE void pairUp(__m256i first, __m256i second, Partial& out) {
        out.v[0] = {_mm256_unpacklo_epi16(first, second)};
        out.v[1] = {_mm256_unpackhi_epi16(first, second)};
    }
    static QORI_INLINE __m256i wide(const S* p, ptrdiff_t n) {
        if constexpr (sizeof(S) == 1) {
            const __m128i bytes = n >= block ? _mm_loadu_si128(reinterpret_cast<const __m128i*>(p))
                                             : qori::detail::loadBelow16(p, static_cast<int>(n));
            return _mm256_cvtepu8_epi16(bytes);
        } else if constexpr (std::is_signed_v<S>) {
            return loadUpTo(p, n).v;
        } else {
            return _mm256_xor_si256(loadUpTo(p, n).v, _mm256_set1_epi16(INT16_MIN));
        }
    }

    /// Bytes: both halves hold the 16 bytes from p (or p + 4), of which one shuffle takes the pairs of elements 0-3 and
    /// 8-11 and widens them.
    struct Free {
        explicit Free(ptrdiff_t nextPixel) : next(nextPixel) {
            alignas(kVectorBytes) uint8_t at[32];
            for (int lane = 0; lane < 8; ++lane) {
                const int element = lane % 4 + lane / 4 * 8;
                at[4 * lane] = static_cast<uint8_t>(element);
                at[4 * lane + 2] = static_cast<uint8_t>(element + static_cast<int>(next));
                at[4 * lane + 1] = at[4 * lane + 3] = 0x80;
            }
            index = load(at);
        }
        QORI_INLINE Sum vector(const S* p, int i) const requires(sizeof(S) == 1) {
            return {shuffleInBlocks(repeatBlock(p + i / 2 * block + i % 2 * 4), index).v};
        }
        QORI_INLINE void operator()(const S* p, bool, Partial& out) const requires(sizeof(S) == 2) {
            pairUp(wide(p, block), wide(p + next, block), out);
        }
        ptrdiff_t next;
        Bytes index;
    };
    static QORI_INLINE void loadExactly(const S* p, const S* second, ptrdiff_t n, Partial& out) {
        pairUp(wide(p, n), second != nullptr ? wide(second, n) : _mm256_setzero_si256(), out);
    }
    static QORI_INLINE __m256i broadcast(const Coefficient* c) { return _mm256_set1_epi32(*c); }
    static QORI_INLINE void add(Sum& sum, Sum in, __m256i c) {
        sum.v = _mm256_add_epi32(sum.v, _mm256_madd_epi16(in.v, c));
        keepOrder(sum.v);
    }
};

/// Pairs of one channel of 16 bits: pixels that are multiplied together are neighbours in memory, and nothing has to be
/// brought together. A block's vectors are its even and its odd elements.
template <class S>
requires(sizeof(S) == 2) struct NeighbourTaps : PairTaps<S> {
    using typename PairTaps<S>::Sum;
    using typename PairTaps<S>::Partial;
    static constexpr int block = PairTaps<S>::block;

    struct Free {
        explicit Free(ptrdiff_t) {}
        QORI_INLINE Sum vector(const S* p, int i) const {
            return {PairTaps<S>::wide(p + i / 2 * block + i % 2, block)};
        }
    };
    static QORI_INLINE void loadExactly(const S* p, const S* second, ptrdiff_t n, Partial& out) {
        const ptrdiff_t pixels = second != nullptr ? n + 1 : n;
        out.v[0] = {PairTaps<S>::wide(p, pixels)};
        out.v[1] = {pixels > 1 ? PairTaps<S>::wide(p + 1, pixels - 1) : _mm256_setzero_si256()};
    }
    /// In the order of PairTaps.
    static QORI_INLINE void end(const Partial& sums, Sum (&out)[2]) {
        out[0] = {_mm256_unpacklo_epi32(sums.v[0].v, sums.v[1].v)};
        out[1] = {_mm256_unpackhi_epi32(sums.v[0].v, sums.v[1].v)};
    }
};

/// Bytes by coefficients of 8 bits whose sums stay below 2^15, the sum of the positive and that of the negative
/// coefficients too: every pair of products and every partial sum fits 16 bits. Starts at 0. The lanes of a block's two
/// vectors are the elements 0-7, 16-23 and 8-15, 24-31, as packing wants them.
struct ByteTaps : TwoVectors<int16_t> {
    using Source = uint8_t;
    using Coefficient = int32_t;  ///< A pair of bytes, the first pixel's first, twice.
    using Sum = Vec<int16_t>;
    using Partial = TwoVectors<int16_t>;
    static constexpr int block = 32, pixels = 2, repeats = 1, overread = 8;
    static constexpr int bandRows = kFewRegisters ? 2 : 4, bandBlocks = 1;
    static constexpr bool unrolls = true;
    static constexpr int64_t kSumLimit = int64_t{127} * 255;  ///< Also keeps each coefficient within 8 bits.

    /// Pairs of eight elements from either half.
    struct Free {
        explicit Free(ptrdiff_t next) {
            alignas(kVectorBytes) uint8_t at[32];
            for (int i = 0; i < 32; ++i) at[i] = static_cast<uint8_t>(i % 16 / 2 + (i % 2) * static_cast<int>(next));
            index = load(at);
        }
        QORI_INLINE Sum vector(const uint8_t* p, int i) const {
            const uint8_t* const at = p + i / 2 * block + i % 2 * 8;
            return {shuffleInBlocks(loadBlocks(at, at + 16), index).v};
        }
        Bytes index;
    };
    static QORI_INLINE void loadExactly(const uint8_t* p, const uint8_t* second, ptrdiff_t n, Partial& out) {
        __m256i pairs[2];
        for (int k = 0; k < 2; ++k, n -= 16) {
            const __m256i none = _mm256_setzero_si256(), low = n > 0 ? PairTaps<uint8_t>::wide(p + 16 * k, n) : none;
            const __m256i high = n > 0 && second != nullptr ? PairTaps<uint8_t>::wide(second + 16 * k, n) : none;
            pairs[k] = _mm256_or_si256(low, _mm256_slli_epi16(high, 8));
        }
        out.v[0] = {_mm256_permute2x128_si256(pairs[0], pairs[1], 0x20)};
        out.v[1] = {_mm256_permute2x128_si256(pairs[0], pairs[1], 0x31)};
    }
    static QORI_INLINE __m256i broadcast(const Coefficient* c) { return _mm256_set1_epi32(*c); }
    static QORI_INLINE void add(Sum& sum, Sum in, __m256i c) {
        sum.v = _mm256_add_epi16(sum.v, _mm256_maddubs_epi16(in.v, c));
        keepOrder(sum.v);
    }
};

/// Bytes of one channel, as NeighbourTaps takes them.
struct NeighbourByteTaps : ByteTaps {
    struct Free {
        explicit Free(ptrdiff_t) {}
        QORI_INLINE Sum vector(const uint8_t* p, int i) const { return {load(p + i / 2 * block + i % 2).v}; }
    };
    static QORI_INLINE void loadExactly(const uint8_t* p, const uint8_t* second, ptrdiff_t n, Partial& out) {
        const ptrdiff_t pixels = second != nullptr ? n + 1 : n;
        out.v[0] = {loadUpTo(p, pixels).v};
        out.v[1] = {pixels > 1 ? loadUpTo(p + 1, pixels - 1).v : _mm256_setzero_si256()};
    }
    static QORI_INLINE void end(const Partial& sums, Sum (&out)[2]) {
        out[0] = {_mm256_unpacklo_epi16(sums.v[0].v, sums.v[1].v)};
        out[1] = {_mm256_unpackhi_epi16(sums.v[0].v, sums.v[1].v)};
    }
};

/// A vector of ByteTaps' sums in 32 bits.
struct WideSum {
    Vec<int32_t> v[2];  ///< The lower four lanes of either half, then the upper four.

    static QORI_INLINE WideSum of(Vec<int16_t> sum) {
        const __m256i sign = _mm256_srai_epi16(sum.v, 15);
        return {{{_mm256_unpacklo_epi16(sum.v, sign)}, {_mm256_unpackhi_epi16(sum.v, sign)}}};
    }
    static QORI_INLINE WideSum of(WideSum sum) { return sum; }
};

/// ByteTaps for larger sums: a few rows of the kernel at a time in 16 bits, which are then added up in 32. Within a
/// group of rows the magnitudes of the coefficients come to at most kMost, so that all its sums lie within 2^16 of each
/// other; a start below zero brings them into the signed range, and partial sums may wrap. Of each pair the positive
/// and the negative coefficients come to at most kMostInPair, which no sum of two products saturates for.
template <class Taps>
struct InGroups : Taps {
    using Ungrouped = Taps;
    using Total = WideSum;
    static constexpr int kMost = 65535 / 255, kMostInPair = 32767 / 255;
};

/// Any type in single precision, fused: the sum of an output is the chain of fused multiply-adds over the kernel's rows
/// from the top and the pixels of a row from the left, wherever the output lies.
template <class S>
struct FloatTaps : TwoVectors<float> {
    using Source = S;
    using Coefficient = float;
    using Sum = Vec<float>;
    using Partial = TwoVectors<float>;
    /// Three rows of two blocks have twelve sums on their way: as many as the latency of two multiply-adds a cycle
    /// asks.
    static constexpr int bandRows = kFewRegisters ? 2 : 3, bandBlocks = kFewRegisters ? 1 : 2;
    static constexpr bool unrolls = false;
    static constexpr int block = 16, pixels = 1, repeats = 4, overread = 0;

    struct Free {
        explicit Free(ptrdiff_t) {}
        QORI_INLINE Sum vector(const S* p, int i) const { return loadWhole(p + 8 * i); }
    };
    static QORI_INLINE Sum convert(__m128i elements) {
        if constexpr (sizeof(S) == 1)
            return {_mm256_cvtepi32_ps(std::is_signed_v<S> ? _mm256_cvtepi8_epi32(elements)
                                                           : _mm256_cvtepu8_epi32(elements))};
        else
            return {_mm256_cvtepi32_ps(std::is_signed_v<S> ? _mm256_cvtepi16_epi32(elements)
                                                           : _mm256_cvtepu16_epi32(elements))};
    }
    static QORI_INLINE Sum loadWhole(const S* p) {
        if constexpr (std::is_same_v<S, float>)
            return load(p);
        else if constexpr (sizeof(S) == 1)
            return convert(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(p)));
        else
            return convert(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p)));
    }
    static QORI_INLINE void loadExactly(const S* p, const S*, ptrdiff_t n, Partial& out) {
        for (int k = 0; k < 2; ++k) {
            const S* const at = p + 8 * k;
            if constexpr (std::is_same_v<S, float>)
                out.v[k] = loadUpTo(at, n - 8 * k);
            else if (n < block)
                out.v[k] = convert(_mm256_castsi256_si128(loadUpTo(at, std::min<ptrdiff_t>(n - 8 * k, 8)).v));
            else
                out.v[k] = loadWhole(at);
        }
    }
    static QORI_INLINE __m256 broadcast(const Coefficient* c) { return _mm256_broadcast_ss(c); }
    static QORI_INLINE void add(Sum& sum, Sum in, __m256 c) { sum.v = _mm256_fmadd_ps(in.v, c, sum.v); }
};

/// As FloatTaps in double precision. Sums of integers are exact while their magnitudes stay below 2^53.
template <class S>
struct DoubleTaps : TwoVectors<double> {
    using Source = S;
    using Coefficient = double;
    using Sum = Vec<double>;
    using Partial = TwoVectors<double>;
    /// Three rows of two blocks have twelve sums on their way: as many as the latency of two multiply-adds a cycle
    /// asks.
    static constexpr int bandRows = kFewRegisters ? 2 : 3, bandBlocks = kFewRegisters ? 1 : 2;
    static constexpr bool unrolls = false;
    static constexpr int block = 8, pixels = 1, repeats = 1, overread = 0;

    struct Free {
        explicit Free(ptrdiff_t) {}
        QORI_INLINE Sum vector(const S* p, int i) const requires(sizeof(S) >= 4) {
            if constexpr (sizeof(S) == 8)
                return load(p + 4 * i);
            else
                return {_mm256_cvtepi32_pd(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p + 4 * i)))};
        }
        QORI_INLINE void operator()(const S* p, bool, Partial& out) const requires(sizeof(S) < 4) {
            loadExactly(p, nullptr, block, out);
        }
    };
    static QORI_INLINE void loadExactly(const S* p, const S*, ptrdiff_t n, Partial& out) {
        if constexpr (sizeof(S) == 8) {
            for (int k = 0; k < 2; ++k) out.v[k] = loadUpTo(p + 4 * k, n - 4 * k);
        } else {
            Vec<int32_t> lanes;
            if constexpr (sizeof(S) == 4)
                lanes = loadUpTo(p, n);
            else
                lanes = extendPart<int32_t>(loadPartial(p, std::min<ptrdiff_t>(n, block)), 0);
            out.v[0] = {_mm256_cvtepi32_pd(_mm256_castsi256_si128(lanes.v))};
            out.v[1] = {_mm256_cvtepi32_pd(_mm256_extracti128_si256(lanes.v, 1))};
        }
    }
    static QORI_INLINE __m256d broadcast(const Coefficient* c) { return _mm256_broadcast_sd(c); }
    static QORI_INLINE void add(Sum& sum, Sum in, __m256d c) { sum.v = _mm256_fmadd_pd(in.v, c, sum.v); }
};

}  // namespace qori::kernels
