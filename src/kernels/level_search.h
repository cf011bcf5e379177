// SPDX-License-Identifier: Apache-2.0
// Places of elements among levels: place p of an element says that p levels are not above it.
#pragma once
#include "simd.h"

namespace qori::kernels {

/// Whether no level is below the one before; NaN is in no order.
template <class L>
bool neverDecreasing(const L* levels, int32_t count) {
    int32_t k = 1;
    for (; k <= count - 8; k += 8) {
        const auto before = load(levels + k - 1), after = load(levels + k);
        int descents;
        if constexpr (std::is_floating_point_v<L>)
            descents = _mm256_movemask_ps(_mm256_cmp_ps(before.v, after.v, _CMP_LE_OQ)) ^ 0xFF;
        else
            descents = _mm256_movemask_epi8(_mm256_cmpgt_epi32(before.v, after.v));
        if (descents != 0) return false;
    }
    for (; k < count; ++k)
        if (!(levels[k - 1] <= levels[k])) return false;
    return true;
}

namespace detail {

/// Eight elements to compare with levels, and eight levels of which some are looked up.
QORI_INLINE __m256 eightOf(const float* p) { return _mm256_loadu_ps(p); }
QORI_INLINE __m256i eightOf(const uint16_t* p) {
    return _mm256_cvtepu16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p)));
}
QORI_INLINE __m256i eightOf(const int16_t* p) {
    return _mm256_cvtepi16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p)));
}
QORI_INLINE __m256 levelsAt(const float* levels, __m256i at) { return _mm256_i32gather_ps(levels, at, 4); }
QORI_INLINE __m256i levelsAt(const int32_t* levels, __m256i at) { return _mm256_i32gather_epi32(levels, at, 4); }

/// `step` in the lanes whose level is not above the element.
QORI_INLINE __m256i stepWhere(__m256 level, __m256 v, __m256i step) {
    return _mm256_and_si256(_mm256_castps_si256(_mm256_cmp_ps(level, v, _CMP_LE_OQ)), step);
}
QORI_INLINE __m256i stepWhere(__m256i level, __m256i v, __m256i step) {
    return _mm256_andnot_si256(_mm256_cmpgt_epi32(level, v), step);
}

}  // namespace detail

/// Places by binary search among levels that never decrease, of 32 elements at a time: the searches hide each other's
/// latency. The number of steps depends on the count alone and no step branches on the data. NaN is above no level.
template <class T, class L>
QORI_NOINLINE void placeBySearch(const T* block, int n, const L* levels, int32_t count, uint32_t* places) {
    constexpr int vectors = 4;
    for (int x = 0; x < n; x += 8 * vectors) {
        __m256i at[vectors];
        for (__m256i& v : at) v = _mm256_setzero_si256();
        for (int32_t left = count; left > 0;) {
            const int32_t half = left - (left >> 1);
            const __m256i step = _mm256_set1_epi32(half), back = _mm256_set1_epi32(half - 1);
            for (int i = 0; i < vectors; ++i) {
                const auto level = detail::levelsAt(levels, _mm256_add_epi32(at[i], back));
                at[i] = _mm256_add_epi32(at[i], detail::stepWhere(level, detail::eightOf(block + x + 8 * i), step));
            }
            left -= half;
        }
        for (int i = 0; i < vectors; ++i) _mm256_storeu_si256(reinterpret_cast<__m256i*>(places + x + 8 * i), at[i]);
    }
}

}  // namespace qori::kernels
