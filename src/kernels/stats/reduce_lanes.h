// SPDX-License-Identifier: Apache-2.0
// Accumulators of integer reductions. All are exact; each states how many vectors its lanes hold.
#pragma once
#include "kernels/vector_math.h"

namespace qori::kernels {

namespace detail {

constexpr ptrdiff_t kNoLimit = PTRDIFF_MAX;

/// Stores 16 32-bit values whose even and odd members are in two vectors.
template <class Word>
QORI_INLINE void storeInterleaved(Word* out, __m256i even, __m256i odd) {
    const __m256i low = _mm256_unpacklo_epi32(even, odd), high = _mm256_unpackhi_epi32(even, odd);
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(out), _mm256_permute2x128_si256(low, high, 0x20));
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(out + 8), _mm256_permute2x128_si256(low, high, 0x31));
}

template <class Word, class Total, int count>
void widen(const Word (&words)[count], Total* out) {
    for (int i = 0; i < count; ++i) out[i] = words[i];
}

/// The even and the odd elements of a vector of bytes as 16-bit numbers.
template <class T>
QORI_INLINE __m256i evenBytes(Vec<T> a) {
    if constexpr (std::is_signed_v<T>)
        return _mm256_srai_epi16(_mm256_slli_epi16(a.v, 8), 8);
    else
        return _mm256_and_si256(a.v, _mm256_set1_epi16(0xFF));
}

template <class T>
QORI_INLINE __m256i oddBytes(Vec<T> a) {
    if constexpr (std::is_signed_v<T>)
        return _mm256_srai_epi16(a.v, 8);
    else
        return _mm256_srli_epi16(a.v, 8);
}

}  // namespace detail

/// A vector and the one at its place in the next round.
template <class T>
struct VectorPair {
    Vec<T> first, second;
};

/// Sums per element position.
template <class T>
struct SumLanes;

/// `all` adds pairs as one 32-bit number, so it is even + 65536 * odd modulo 2^32, and `odd` the upper halves alone:
/// three operations for 16 elements. Sums up to 65535 * 65537 = 2^32 - 1 fit.
template <>
struct SumLanes<uint16_t> {
    using Total = uint64_t;
    static constexpr int banks = 1, count = 16;
    static constexpr ptrdiff_t limit = 65'537;

    __m256i all, odd;

    QORI_INLINE void add(Vec<uint16_t> a) {
        loadOnce(a.v);
        all = _mm256_add_epi32(all, a.v);
        odd = _mm256_add_epi32(odd, _mm256_srli_epi32(a.v, 16));
    }
    void values(Total* out) const {
        uint32_t words[count];
        detail::storeInterleaved(words, _mm256_sub_epi32(all, _mm256_slli_epi32(odd, 16)), odd);
        detail::widen(words, out);
    }
};

/// Multiplication by (1, 0) takes the even element of a pair. Sums down to -32768 * 65535 > -2^31 fit.
template <>
struct SumLanes<int16_t> {
    using Total = int64_t;
    static constexpr int banks = 1, count = 16;
    static constexpr ptrdiff_t limit = 65'535;

    __m256i even, odd;

    QORI_INLINE void add(Vec<int16_t> a) {
        loadOnce(a.v);
        even = _mm256_add_epi32(even, _mm256_madd_epi16(a.v, _mm256_set1_epi32(1)));
        odd = _mm256_add_epi32(odd, _mm256_srai_epi32(a.v, 16));
    }
    void values(Total* out) const {
        int32_t words[count];
        detail::storeInterleaved(words, even, odd);
        detail::widen(words, out);
    }
};

/// What 8-bit sums spill into: 16-bit numbers, of the even and of the odd bytes.
struct EvenOddSums {
    using Total = uint64_t;
    static constexpr int banks = 1, count = 32;
    static constexpr ptrdiff_t limit = SumLanes<uint16_t>::limit;

    SumLanes<uint16_t> even, odd;

    void values(Total* out) const {
        Total halves[2][16];
        even.values(halves[0]);
        odd.values(halves[1]);
        for (int i = 0; i < count; ++i) out[i] = halves[i % 2][i / 2];
    }
};

/// As for 16 bits, with halves that hold 255 * 257 = 2^16 - 1.
template <>
struct SumLanes<uint8_t> {
    using Next = EvenOddSums;
    static constexpr int banks = 1;
    static constexpr ptrdiff_t limit = 257;

    __m256i all, odd;

    QORI_INLINE void add(Bytes a) {
        loadOnce(a.v);
        all = _mm256_add_epi16(all, a.v);
        odd = _mm256_add_epi16(odd, _mm256_srli_epi16(a.v, 8));
    }
    void spillTo(Next& next) const {
        next.even.add({_mm256_sub_epi16(all, _mm256_slli_epi16(odd, 8))});
        next.odd.add({odd});
    }
};

/// Sum of |a - b| of bytes for one channel. A lane grows by at most 8 * 255 a vector: 2^31 of them stay far below 2^64.
struct SadLanes {
    using Total = uint64_t;
    static constexpr int banks = 1, count = 4;
    static constexpr ptrdiff_t limit = INT32_MAX;

    __m256i sum;

    QORI_INLINE void add(Bytes a, Bytes b) { sum = _mm256_add_epi64(sum, _mm256_sad_epu8(a.v, b.v)); }
    void values(Total* out) const { _mm256_storeu_si256(reinterpret_cast<__m256i*>(out), sum); }
};

/// Sums of products per element position.
template <class T>
struct ProductLanes;

/// Byte products, of two rounds at a time: 16-bit words of both are interleaved, so that an instruction that adds pairs
/// of products adds those of one channel. A round adds at most 2 * 255^2 = 130,050, and 33,025 * 130,050 < 2^32;
/// signed, 33,025 * 2 * 128^2 < 2^31.
template <class T>
requires(sizeof(T) == 1) struct ProductLanes<T> {
    using Word = std::conditional_t<std::is_signed_v<T>, int32_t, uint32_t>;
    using Total = std::conditional_t<std::is_signed_v<T>, int64_t, uint64_t>;
    static constexpr int banks = 1, count = 32;
    static constexpr bool takesTwo = true;
    static constexpr ptrdiff_t limit = 33'025;

    struct Sums {
        __m256i even, odd;

        QORI_INLINE void add(Vec<T> a, Vec<T> b) {
            even = _mm256_add_epi32(even, _mm256_madd_epi16(detail::evenBytes(a), detail::evenBytes(b)));
            odd = _mm256_add_epi32(odd, _mm256_madd_epi16(detail::oddBytes(a), detail::oddBytes(b)));
        }
    };
    Sums low, high;  ///< Of the lower and the upper 8 bytes of each half.

    QORI_INLINE void add(VectorPair<T> a, VectorPair<T> b) {
        low.add({_mm256_unpacklo_epi16(a.first.v, a.second.v)}, {_mm256_unpacklo_epi16(b.first.v, b.second.v)});
        high.add({_mm256_unpackhi_epi16(a.first.v, a.second.v)}, {_mm256_unpackhi_epi16(b.first.v, b.second.v)});
    }
    void values(Total* out) const {
        Word words[2][2][8];  // by part of the half, by half
        detail::storeInterleaved(words[0][0], low.even, low.odd);
        detail::storeInterleaved(words[1][0], high.even, high.odd);
        for (int i = 0; i < count; ++i) out[i] = words[i / 8 % 2][i / 16][i % 8];
    }
};

/// Products of 16 bits in two halves, low (always unsigned) and high, summed apart.
template <class T>
requires(sizeof(T) == 2) struct ProductLanes<T> {
    using Total = typename SumLanes<T>::Total;
    static constexpr int banks = 1, count = 16;
    static constexpr ptrdiff_t limit = 65'535;

    SumLanes<uint16_t> low;
    SumLanes<T> high;

    QORI_INLINE void add(Vec<T> a, Vec<T> b) {
        loadOnce(a.v);
        loadOnce(b.v);
        low.add({_mm256_mullo_epi16(a.v, b.v)});
        if constexpr (std::is_signed_v<T>)
            high.add({_mm256_mulhi_epi16(a.v, b.v)});
        else
            high.add({_mm256_mulhi_epu16(a.v, b.v)});
    }
    void values(Total* out) const {
        uint64_t lows[count];
        low.values(lows);
        high.values(out);
        for (int i = 0; i < count; ++i) out[i] = out[i] * 65'536 + static_cast<Total>(lows[i]);
    }
};

/// Products of bytes for one channel: a lane grows by four products, at most 4 * 255^2 = 260,100 a vector, and
/// 16,512 * 260,100 < 2^32.
struct PairProductLanes {
    using Total = uint64_t;
    static constexpr int banks = 1, count = 8;
    static constexpr ptrdiff_t limit = 16'512;

    __m256i sum;

    QORI_INLINE void addPairs(__m256i a, __m256i b) { sum = _mm256_add_epi32(sum, _mm256_madd_epi16(a, b)); }
    QORI_INLINE void add(Bytes a, Bytes b) {
        loadOnce(a.v);
        loadOnce(b.v);
        addPairs(detail::evenBytes(a), detail::evenBytes(b));
        addPairs(detail::oddBytes(a), detail::oddBytes(b));
    }
    /// Squares of a - b: the bytes interleaved, then multiplied by 1 and -1 and added in pairs.
    QORI_INLINE void addSquaredDifference(Bytes a, Bytes b) {
        loadOnce(a.v);
        loadOnce(b.v);
        const __m256i signs = _mm256_set1_epi16(static_cast<int16_t>(0xFF01));
        const __m256i low = _mm256_maddubs_epi16(_mm256_unpacklo_epi8(a.v, b.v), signs);
        const __m256i high = _mm256_maddubs_epi16(_mm256_unpackhi_epi8(a.v, b.v), signs);
        addPairs(low, low);
        addPairs(high, high);
    }
    void values(Total* out) const {
        uint32_t words[count];
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(words), sum);
        detail::widen(words, out);
    }
};

/// Largest of unsigned numbers, or of float magnitudes, which ignores NaN.
template <class T>
struct MaxLanes {
    using Total = T;
    static constexpr int banks = 2, count = Vec<T>::lanes;
    static constexpr ptrdiff_t limit = detail::kNoLimit;

    Vec<T> largest;

    static constexpr T join(T a, T b) { return a > b ? a : b; }
    QORI_INLINE void add(Vec<T> a) {
        if constexpr (std::is_same_v<T, float>)
            largest.v = _mm256_max_ps(a.v, largest.v);
        else if constexpr (sizeof(T) == 1)
            largest.v = _mm256_max_epu8(a.v, largest.v);
        else if constexpr (sizeof(T) == 2)
            largest.v = _mm256_max_epu16(a.v, largest.v);
        else
            largest.v = _mm256_max_epu32(a.v, largest.v);
    }
    void values(Total* out) const { store(out, largest); }
};

}  // namespace qori::kernels
