// SPDX-License-Identifier: Apache-2.0
// In which interval the elements of a block lie, and what constants make of them. Place p is interval p - 1; place 0
// and the place behind the last interval are outside. Blocks are readable up to whole vectors.
#pragma once
#include "kernels/level_search.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// How places are found.
enum class Search {
    comparison,  ///< With every level; levels never decrease.
    halving,     ///< Levels never decrease.
    first,       ///< Any levels, the first interval that holds an element counts.
    last,        ///< Any levels, the last interval that holds an element counts.
    lastOrTail   ///< As last, but from the last level on elements are outside.
};

inline constexpr int kMostCompared = 32;  ///< Levels above which halving is quicker.

namespace detail {

QORI_INLINE __m256i eightLevels(int32_t level) { return _mm256_set1_epi32(level); }
QORI_INLINE __m256 eightLevels(float level) { return _mm256_set1_ps(level); }

/// All bits of the lanes whose level is not above the element. No comparison with NaN holds.
QORI_INLINE __m256i isReached(__m256i level, __m256i v) {
    return _mm256_xor_si256(_mm256_cmpgt_epi32(level, v), _mm256_set1_epi32(-1));
}
QORI_INLINE __m256i isReached(__m256 level, __m256 v) {
    return _mm256_castps_si256(_mm256_cmp_ps(level, v, _CMP_LE_OQ));
}
QORI_INLINE __m256i isBelow(__m256i v, __m256i level) { return _mm256_cmpgt_epi32(level, v); }
QORI_INLINE __m256i isBelow(__m256 v, __m256 level) { return _mm256_castps_si256(_mm256_cmp_ps(v, level, _CMP_LT_OQ)); }

template <class T, class L>
QORI_NOINLINE void placeByComparison(const T* block, int n, const L* levels, int32_t count, uint32_t* places) {
    for (int x = 0; x < n; x += 8) {
        const auto v = eightOf(block + x);
        __m256i at = _mm256_setzero_si256();
        for (int32_t k = 0; k < count; ++k) at = _mm256_sub_epi32(at, isReached(eightLevels(levels[k]), v));
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(places + x), at);
    }
}

/// The intervals in the order in which the later one counts.
template <class T, class L>
QORI_NOINLINE void placeOneByOne(const T* block, int n, const L* levels, int32_t count, Search way, uint32_t* places) {
    for (int x = 0; x < n; x += 8) {
        const auto v = eightOf(block + x);
        __m256i at = _mm256_setzero_si256();
        for (int32_t i = 0; i < count - 1; ++i) {
            const int32_t k = way == Search::first ? count - 2 - i : i;
            const __m256i holds =
                _mm256_and_si256(isReached(eightLevels(levels[k]), v), isBelow(v, eightLevels(levels[k + 1])));
            at = _mm256_blendv_epi8(at, _mm256_set1_epi32(k + 1), holds);
        }
        if (way == Search::lastOrTail) at = _mm256_andnot_si256(isReached(eightLevels(levels[count - 1]), v), at);
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(places + x), at);
    }
}

}  // namespace detail

template <class T, class L>
void findPlaces(const T* block, int n, const L* levels, int32_t count, Search way, uint32_t* places) {
    switch (way) {
        case Search::comparison: return detail::placeByComparison(block, n, levels, count, places);
        case Search::halving: return placeBySearch(block, n, levels, count, places);
        default: return detail::placeOneByOne(block, n, levels, count, way, places);
    }
}

/// The interval's value, saturated to 16 bits, or the element where it is outside.
template <class T, class L>
QORI_NOINLINE void replaceByValues(T* block, int n, const uint32_t* places, const L* values, int32_t count) {
    for (int x = 0; x < n; x += 8) {
        const __m256i k =
            _mm256_sub_epi32(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(places + x)), _mm256_set1_epi32(1));
        const __m256i inside =
            _mm256_andnot_si256(_mm256_srai_epi32(k, 31), _mm256_cmpgt_epi32(_mm256_set1_epi32(count - 1), k));
        if constexpr (std::is_floating_point_v<T>) {
            const __m256 v = _mm256_loadu_ps(block + x);
            _mm256_storeu_ps(block + x,
                             _mm256_mask_i32gather_ps(v, values, k, _mm256_castsi256_ps(inside), sizeof(float)));
        } else {
            constexpr int32_t lowest = std::is_signed_v<T> ? -32'768 : 0;
            __m256i v = _mm256_mask_i32gather_epi32(detail::eightOf(block + x), values, k, inside, sizeof(int32_t));
            v = _mm256_min_epi32(_mm256_max_epi32(v, _mm256_set1_epi32(lowest)), _mm256_set1_epi32(lowest + 65'535));
            const __m256i narrow = std::is_signed_v<T> ? _mm256_packs_epi32(v, v) : _mm256_packus_epi32(v, v);
            _mm_storeu_si128(reinterpret_cast<__m128i*>(block + x),
                             _mm256_castsi256_si128(_mm256_permute4x64_epi64(narrow, 0x08)));
        }
    }
}

}  // namespace qori::kernels
