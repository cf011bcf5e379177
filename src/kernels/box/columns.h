// SPDX-License-Identifier: Apache-2.0
// Sums down columns and of shifted rows: the additions that windows are made of.
//
// Sums of integers are exact as long as the type holds the sum of a window; 32 bits may wrap in between. Sums of floats
// are made of the window's own elements only, never by taking away what has left, so that what an element does to
// results ends where its windows end. They read the control register: run them under the default one.
#pragma once
#include "kernels/vector_math.h"

namespace qori::kernels {

namespace detail {

template <class T>
QORI_INLINE __m128i lowHalf(Vec<T> a) {
    return _mm256_castsi256_si128(a.v);
}

/// Zeros behind the first `count` bytes at p.
template <int bytes>
QORI_INLINE __m128i loadBytes(const void* p, ptrdiff_t count) {
    if (count < bytes) return lowHalf(loadPartial(static_cast<const uint8_t*>(p), count));
    if constexpr (bytes == 16)
        return _mm_loadu_si128(static_cast<const __m128i*>(p));
    else if constexpr (bytes == 8)
        return _mm_loadl_epi64(static_cast<const __m128i*>(p));
    else
        return _mm_cvtsi32_si128(qori::detail::loadWord<int32_t>(static_cast<const uint8_t*>(p)));
}

}  // namespace detail

/// Whole vectors, in a place for counts.
template <class S>
inline constexpr std::integral_constant<ptrdiff_t, Vec<S>::lanes> kWhole{};

/// The first `count` elements at p (at most a vector of S has lanes) as sums; int16_t with 2^15 on top, so that all
/// integer sums are unsigned.
template <class S, class T>
QORI_INLINE Vec<S> loadAs(const T* p, ptrdiff_t count) {
    if constexpr (std::is_same_v<S, T>) {
        return loadUpTo(p, count);
    } else {
        constexpr int kBytes = Vec<S>::lanes * static_cast<int>(sizeof(T));
        const __m128i packed = detail::loadBytes<kBytes>(p, count * static_cast<ptrdiff_t>(sizeof(T)));
        if constexpr (std::is_same_v<S, uint16_t>)
            return {_mm256_cvtepu8_epi16(packed)};
        else if constexpr (std::is_same_v<S, uint32_t> && sizeof(T) == 1)
            return {_mm256_cvtepu8_epi32(packed)};
        else if constexpr (std::is_same_v<S, uint32_t> && std::is_unsigned_v<T>)
            return {_mm256_cvtepu16_epi32(packed)};
        else if constexpr (std::is_same_v<S, uint32_t>)
            return {_mm256_add_epi32(_mm256_cvtepi16_epi32(packed), _mm256_set1_epi32(32768))};
        else if constexpr (sizeof(T) == 1)
            return {_mm256_cvtepi32_pd(_mm_cvtepu8_epi32(packed))};
        else if constexpr (std::is_unsigned_v<T>)
            return {_mm256_cvtepi32_pd(_mm_cvtepu16_epi32(packed))};
        else
            return {_mm256_cvtepi32_pd(_mm_add_epi32(_mm_cvtepi16_epi32(packed), _mm_set1_epi32(32768)))};
    }
}

/// Calls body(i, count) for whole vectors of S, then for what is left.
template <class S, class Body>
QORI_INLINE void forVectors(ptrdiff_t elements, Body body) {
    ptrdiff_t i = 0;
    for (; i + Vec<S>::lanes <= elements; i += Vec<S>::lanes) body(i, kWhole<S>);
    if (i < elements) body(i, elements - i);
}

/// Terms that one pass adds up.
inline constexpr int kMostTerms = 8;

/// sums[i] = term[0][i] + term[1][i] + ..., in this order.
template <int terms, class S, class T>
QORI_NOINLINE void sumTerms(const T* const* term, S* sums, ptrdiff_t elements) {
    const T* from[terms];
    for (int k = 0; k < terms; ++k) from[k] = term[k];
    forVectors<S>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            Vec<S> sum = loadAs<S>(from[0] + i, count);
            for (int k = 1; k < terms; ++k) sum = sum + loadAs<S>(from[k] + i, count);
            storeUpTo(sums + i, sum, count);
        });
}

/// count: 1 to kMostTerms.
template <class S, class T>
void sumTerms(const T* const* term, int count, S* sums, ptrdiff_t elements) {
    switch (count) {
        case 1: return sumTerms<1>(term, sums, elements);
        case 2: return sumTerms<2>(term, sums, elements);
        case 3: return sumTerms<3>(term, sums, elements);
        case 4: return sumTerms<4>(term, sums, elements);
        case 5: return sumTerms<5>(term, sums, elements);
        case 6: return sumTerms<6>(term, sums, elements);
        case 7: return sumTerms<7>(term, sums, elements);
        default: return sumTerms<8>(term, sums, elements);
    }
}

/// sums += row.
template <class S, class T>
QORI_NOINLINE void addRow(S* sums, const T* row, ptrdiff_t elements) {
    forVectors<S>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            storeUpTo(sums + i, loadUpTo(sums + i, count) + loadAs<S>(row + i, count), count);
        });
}

/// sums += entering - leaving; integers, where this is exact.
template <class S, class T>
QORI_NOINLINE void slideRow(S* sums, const T* entering, const T* leaving, ptrdiff_t elements) {
    forVectors<S>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            const Vec<S> change = loadAs<S>(entering + i, count) - loadAs<S>(leaving + i, count);
            storeUpTo(sums + i, loadUpTo(sums + i, count) + change, count);
        });
}

/// sums += entering, total = sums + rest. The processor is told of the row `ahead` of the entering one, which comes
/// next: it sees no further than the ends of rows by itself.
template <class S, class T>
QORI_NOINLINE void addRowTo(S* sums, const T* entering, const S* rest, S* total, bool isFirst, ptrdiff_t elements,
                            ptrdiff_t ahead) {
    constexpr ptrdiff_t n = Vec<S>::lanes;
    const auto add = [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
        Vec<S> sum = loadAs<S>(entering + i, count);
        if (!isFirst) sum = loadUpTo(sums + i, count) + sum;
        storeUpTo(sums + i, sum, count);
        storeUpTo(total + i, sum + loadUpTo(rest + i, count), count);
    };
    ptrdiff_t i = 0;
    for (; i + 2 * n <= elements; i += 2 * n) {
        __builtin_prefetch(entering + i + ahead);
        for (int v = 0; v < 2; ++v) add(i + v * n, kWhole<S>);
    }
    for (; i < elements; i += n) i + n <= elements ? add(i, kWhole<S>) : add(i, elements - i);
}

/// Element i of a vector's `channels` interleaved running sums: the sum of all elements of its channel up to it.
template <int channels>
QORI_INLINE Vec<uint32_t> sumsUpTo(Vec<uint32_t> a) {
    __m256i x = a.v;
    const __m256i zero = _mm256_setzero_si256();
    if constexpr (channels == 1) {
        x = _mm256_add_epi32(x, _mm256_slli_si256(x, 4));
        x = _mm256_add_epi32(x, _mm256_slli_si256(x, 8));
        const __m256i ofLow = _mm256_permutevar8x32_epi32(x, _mm256_set1_epi32(3));
        x = _mm256_add_epi32(x, _mm256_blend_epi32(zero, ofLow, 0xF0));
    } else if constexpr (channels == 3) {
        const __m256i by3 = _mm256_permutevar8x32_epi32(x, _mm256_setr_epi32(0, 0, 0, 0, 1, 2, 3, 4));
        x = _mm256_add_epi32(x, _mm256_blend_epi32(zero, by3, 0xF8));
        const __m256i by6 = _mm256_permutevar8x32_epi32(x, _mm256_setr_epi32(0, 0, 0, 0, 0, 0, 0, 1));
        x = _mm256_add_epi32(x, _mm256_blend_epi32(zero, by6, 0xC0));
    } else {
        x = _mm256_add_epi32(x, _mm256_permute2x128_si256(x, x, 0x08));
    }
    return {x};
}

/// For each lane of the next vector, the last lane of its channel in this one.
template <int channels>
QORI_INLINE Vec<uint32_t> lastOfChannels(Vec<uint32_t> a) {
    if constexpr (channels == 1)
        return {_mm256_permutevar8x32_epi32(a.v, _mm256_set1_epi32(7))};
    else if constexpr (channels == 3)
        return {_mm256_permutevar8x32_epi32(a.v, _mm256_setr_epi32(5, 6, 7, 5, 6, 7, 5, 6))};
    else
        return {_mm256_permute2x128_si256(a.v, a.v, 0x11)};
}

}  // namespace qori::kernels
