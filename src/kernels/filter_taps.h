// SPDX-License-Identifier: Apache-2.0
// The sums of a linear filter: how a block of neighbouring elements takes one tap. A tap is the smallest piece of a
// kernel row that has one coefficient word: one pixel, or a pair of pixels where integers are multiplied two at a time.
//
// Taps offers    Source, Coefficient           element types of the image and of the packed kernel
//                Sum                           a vector of sums; a block has two
//                block                         elements of a block
//                pixels                        pixels of a tap
//                repeats                       copies of a coefficient in the packed kernel, one after the other
//                overread                      elements that Free may read behind the last pixel of a block's window
//                Free                          loads a block of sources at p, a tap's second pixel `next` elements on
//                loadExactly(p, second, n, v)  the first n elements of a block and nothing else; second is null where
//                                              the tap is the single last pixel of an odd row
//                add(sum, v, coefficient)      sum + v * coefficient
#pragma once
#include "pack_convert.h"

namespace qori::kernels {

/// Integers in pairs of neighbouring pixels: a 32-bit lane holds both as 16 bits, and one multiply-add of 16-bit words
/// adds both products. A pair of products can leave 32 bits only where all four factors are -32768; it then wraps to
/// -2^31, and every addition wraps too, so that a lane always is the sum modulo 2^32. Unsigned 16-bit pixels are taken
/// less 32768, which a sum that starts at 32768 times the sum of the kernel makes good.
///
/// The lanes of a block's two vectors are the elements 0-3, 8-11 and 4-7, 12-15, as unpacking leaves them and packing
/// wants them.
template <class S>
struct PairTaps {
    using Source = S;
    using Coefficient = int32_t;  ///< The first pixel's in the low half.
    using Sum = Vec<int32_t>;
    static constexpr int block = 16, pixels = 2, repeats = 4;
    /// Bytes take 20 from p on; the pair that ends an odd row takes one pixel, of at most 4 elements, too many.
    static constexpr int overread = 4;

    static QORI_INLINE void pairUp(__m256i first, __m256i second, Sum (&v)[2]) {
        v[0] = {_mm256_unpacklo_epi16(first, second)};
        v[1] = {_mm256_unpackhi_epi16(first, second)};
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
            alignas(32) uint8_t at[32];
            for (int lane = 0; lane < 8; ++lane) {
                const int element = lane % 4 + lane / 4 * 8;
                at[4 * lane] = static_cast<uint8_t>(element);
                at[4 * lane + 2] = static_cast<uint8_t>(element + static_cast<int>(next));
                at[4 * lane + 1] = at[4 * lane + 3] = 0x80;
            }
            index = load(at);
        }
        QORI_INLINE void operator()(const S* p, Sum (&v)[2]) const {
            if constexpr (sizeof(S) == 1) {
                v[0] = {shuffleHalves(loadTwice(p), index).v};
                v[1] = {shuffleHalves(loadTwice(p + 4), index).v};
            } else {
                pairUp(wide(p, block), wide(p + next, block), v);
            }
        }
        ptrdiff_t next;
        Bytes index;
    };
    static QORI_INLINE void loadExactly(const S* p, const S* second, ptrdiff_t n, Sum (&v)[2]) {
        pairUp(wide(p, n), second != nullptr ? wide(second, n) : _mm256_setzero_si256(), v);
    }
    static QORI_INLINE __m256i broadcast(const Coefficient* c) { return _mm256_set1_epi32(*c); }
    static QORI_INLINE Sum add(Sum sum, Sum v, __m256i c) {
        return {_mm256_add_epi32(sum.v, _mm256_madd_epi16(v.v, c))};
    }
};

/// Any type in single precision, fused: the sum of an output is the chain of fused multiply-adds over the kernel's rows
/// from the top and the pixels of a row from the left, wherever the output lies.
template <class S>
struct FloatTaps {
    using Source = S;
    using Coefficient = float;
    using Sum = Vec<float>;
    static constexpr int block = 16, pixels = 1, repeats = 4, overread = 0;

    struct Free {
        explicit Free(ptrdiff_t) {}
        QORI_INLINE void operator()(const S* p, Sum (&v)[2]) const { loadExactly(p, nullptr, block, v); }
    };
    static QORI_INLINE Sum convert(__m128i elements) {
        if constexpr (sizeof(S) == 1)
            return {_mm256_cvtepi32_ps(std::is_signed_v<S> ? _mm256_cvtepi8_epi32(elements)
                                                           : _mm256_cvtepu8_epi32(elements))};
        else
            return {_mm256_cvtepi32_ps(std::is_signed_v<S> ? _mm256_cvtepi16_epi32(elements)
                                                           : _mm256_cvtepu16_epi32(elements))};
    }
    static QORI_INLINE void loadExactly(const S* p, const S*, ptrdiff_t n, Sum (&v)[2]) {
        for (int k = 0; k < 2; ++k) {
            const S* const at = p + 8 * k;
            if constexpr (std::is_same_v<S, float>)
                v[k] = loadUpTo(at, n - 8 * k);
            else if (n < block)
                v[k] = convert(_mm256_castsi256_si128(loadUpTo(at, std::min<ptrdiff_t>(n - 8 * k, 8)).v));
            else if constexpr (sizeof(S) == 1)
                v[k] = convert(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(at)));
            else
                v[k] = convert(_mm_loadu_si128(reinterpret_cast<const __m128i*>(at)));
        }
    }
    static QORI_INLINE __m256 broadcast(const Coefficient* c) { return _mm256_broadcast_ss(c); }
    static QORI_INLINE Sum add(Sum sum, Sum v, __m256 c) { return {_mm256_fmadd_ps(v.v, c, sum.v)}; }
};

/// As FloatTaps in double precision. Sums of integers are exact while their magnitudes stay below 2^53.
template <class S>
struct DoubleTaps {
    using Source = S;
    using Coefficient = double;
    using Sum = Vec<double>;
    static constexpr int block = 8, pixels = 1, repeats = 1, overread = 0;

    struct Free {
        explicit Free(ptrdiff_t) {}
        QORI_INLINE void operator()(const S* p, Sum (&v)[2]) const { loadExactly(p, nullptr, block, v); }
    };
    static QORI_INLINE void loadExactly(const S* p, const S*, ptrdiff_t n, Sum (&v)[2]) {
        if constexpr (sizeof(S) == 8) {
            for (int k = 0; k < 2; ++k) v[k] = loadUpTo(p + 4 * k, n - 4 * k);
        } else {
            Vec<int32_t> lanes;
            if constexpr (sizeof(S) == 4)
                lanes = loadUpTo(p, n);
            else
                lanes = extendPart<int32_t>(loadPartial(p, std::min<ptrdiff_t>(n, block)), 0);
            v[0] = {_mm256_cvtepi32_pd(_mm256_castsi256_si128(lanes.v))};
            v[1] = {_mm256_cvtepi32_pd(_mm256_extracti128_si256(lanes.v, 1))};
        }
    }
    static QORI_INLINE __m256d broadcast(const Coefficient* c) { return _mm256_broadcast_sd(c); }
    static QORI_INLINE Sum add(Sum sum, Sum v, __m256d c) { return {_mm256_fmadd_pd(v.v, c, sum.v)}; }
};

}  // namespace qori::kernels
