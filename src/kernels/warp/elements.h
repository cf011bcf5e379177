// SPDX-License-Identifier: Apache-2.0
// Elements as floats and back. Integers are rounded to nearest, ties to even.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels::warp {

/// Four elements at p.
template <class T>
QORI_INLINE __m128 loadFour(const uint8_t* p) {
    if constexpr (std::is_same_v<T, float>) return _mm_loadu_ps(reinterpret_cast<const float*>(p));
    if constexpr (sizeof(T) == 1)
        return _mm_cvtepi32_ps(_mm_cvtepu8_epi32(_mm_cvtsi32_si128(qori::detail::loadWord<int32_t>(p))));
    const __m128i words = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(p));
    return _mm_cvtepi32_ps(std::is_signed_v<T> ? _mm_cvtepi16_epi32(words) : _mm_cvtepu16_epi32(words));
}

/// Eight elements in 8 or 16 bytes.
template <class T>
QORI_INLINE __m256 widenEight(__m128i elements) {
    if constexpr (sizeof(T) == 1) return _mm256_cvtepi32_ps(_mm256_cvtepu8_epi32(elements));
    return _mm256_cvtepi32_ps(std::is_signed_v<T> ? _mm256_cvtepi16_epi32(elements) : _mm256_cvtepu16_epi32(elements));
}

template <class T>
QORI_INLINE __m256 loadEight(const uint8_t* p) {
    if constexpr (std::is_same_v<T, float>)
        return _mm256_loadu_ps(reinterpret_cast<const float*>(p));
    else if constexpr (sizeof(T) == 1)
        return widenEight<T>(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(p)));
    else
        return widenEight<T>(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p)));
}

/// Six elements and nothing behind them; the last two lanes hold anything finite if the elements are.
template <class T>
QORI_INLINE __m256 loadSix(const uint8_t* p) {
    constexpr int two = 2 * static_cast<int>(sizeof(T));
    if constexpr (std::is_same_v<T, float>) {
        const __m128 low = _mm_loadu_ps(reinterpret_cast<const float*>(p));
        const __m128 high = _mm_loadu_ps(reinterpret_cast<const float*>(p + two));
        return _mm256_insertf128_ps(_mm256_castps128_ps256(low), _mm_movehl_ps(high, high), 1);
    } else if constexpr (sizeof(T) == 1) {
        const __m128i low = _mm_cvtsi32_si128(qori::detail::loadWord<int32_t>(p));
        const __m128i high = _mm_cvtsi32_si128(qori::detail::loadWord<uint16_t>(p + 4));
        return widenEight<T>(_mm_unpacklo_epi32(low, high));
    } else {
        const __m128i low = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(p));
        const __m128i high = _mm_cvtsi32_si128(qori::detail::loadWord<int32_t>(p + 8));
        return widenEight<T>(_mm_unpacklo_epi64(low, high));
    }
}

/// Four floats as elements, in the low 4, 8 or 16 bytes; integers out of range saturate, NaN gives the least.
template <class T>
QORI_INLINE __m128i narrowFour(__m128 v) {
    if constexpr (std::is_same_v<T, float>) return _mm_castps_si128(v);
    const __m128i whole = _mm_cvtps_epi32(v);
    if constexpr (std::is_same_v<T, int16_t>) return _mm_packs_epi32(whole, whole);
    const __m128i words = _mm_packus_epi32(whole, whole);
    if constexpr (sizeof(T) == 2) return words;
    return _mm_packus_epi16(words, words);
}

/// The first elements of a vector of four.
template <class T, int count>
QORI_INLINE void storeFirst(uint8_t* dst, __m128i elements) {
    constexpr int bytes = count * static_cast<int>(sizeof(T));
    if constexpr (bytes == 16)
        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst), elements);
    else
        qori::detail::storeBelow16(dst, elements, bytes);
}

/// Holds weighted sums to what T can have, so that their conversion does not overflow.
template <class T>
QORI_INLINE __m128 clampTo(__m128 v) {
    if constexpr (std::is_same_v<T, float>) return v;
    constexpr float least = std::is_same_v<T, int16_t> ? -32768 : 0;
    constexpr float most = sizeof(T) == 1 ? 255 : std::is_same_v<T, int16_t> ? 32767 : 65535;
    return _mm_min_ps(_mm_max_ps(v, _mm_set1_ps(least)), _mm_set1_ps(most));
}

}  // namespace qori::kernels::warp
