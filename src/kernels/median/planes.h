// SPDX-License-Identifier: Apache-2.0
// Pixels of tiles that lie side by side as planes: every so many-th element of a row together, and back.
#pragma once
#include <utility>

#include "kernels/simd.h"

namespace qori::kernels::planes {

/// Of two vectors, the elements of even places and those of odd ones, in order.
template <class T>
QORI_INLINE void split(Vec<T>& a, Vec<T>& b) {
    const __m256i x = toInteger(a.v), y = toInteger(b.v);
    __m256i even, odd;
    if constexpr (sizeof(T) == 1) {
        const __m256i low = _mm256_set1_epi16(0xFF);
        even = _mm256_packus_epi16(_mm256_and_si256(x, low), _mm256_and_si256(y, low));
        odd = _mm256_packus_epi16(_mm256_srli_epi16(x, 8), _mm256_srli_epi16(y, 8));
    } else if constexpr (sizeof(T) == 2) {
        const __m256i low = _mm256_set1_epi32(0xFFFF);
        even = _mm256_packus_epi32(_mm256_and_si256(x, low), _mm256_and_si256(y, low));
        odd = _mm256_packus_epi32(_mm256_srli_epi32(x, 16), _mm256_srli_epi32(y, 16));
    } else if constexpr (sizeof(T) == 4) {
        const __m256 p = _mm256_castsi256_ps(x), q = _mm256_castsi256_ps(y);
        even = _mm256_castps_si256(_mm256_shuffle_ps(p, q, 0x88));
        odd = _mm256_castps_si256(_mm256_shuffle_ps(p, q, 0xDD));
    } else {
        even = _mm256_unpacklo_epi64(x, y);
        odd = _mm256_unpackhi_epi64(x, y);
    }
    a = fromInteger<T>(_mm256_permute4x64_epi64(even, 0xD8));
    b = fromInteger<T>(_mm256_permute4x64_epi64(odd, 0xD8));
}

/// Undoes it.
template <class T>
QORI_INLINE void join(Vec<T>& even, Vec<T>& odd) {
    const __m256i x = toInteger(even.v), y = toInteger(odd.v);
    __m256i low, high;
    if constexpr (sizeof(T) == 1) {
        low = _mm256_unpacklo_epi8(x, y);
        high = _mm256_unpackhi_epi8(x, y);
    } else if constexpr (sizeof(T) == 2) {
        low = _mm256_unpacklo_epi16(x, y);
        high = _mm256_unpackhi_epi16(x, y);
    } else if constexpr (sizeof(T) == 4) {
        low = _mm256_unpacklo_epi32(x, y);
        high = _mm256_unpackhi_epi32(x, y);
    } else {
        low = _mm256_unpacklo_epi64(x, y);
        high = _mm256_unpackhi_epi64(x, y);
    }
    even = fromInteger<T>(_mm256_permute2x128_si256(low, high, 0x20));
    odd = fromInteger<T>(_mm256_permute2x128_si256(low, high, 0x31));
}

inline constexpr int kMost = 16;

/// n vectors of a row become n planes of a vector each: plane p has elements p, p + n, ... A step takes the lowest bit
/// of an element's number to the top; after log2(n) of them the plane's number is there.
template <int n, class T>
QORI_INLINE void splitAll(Vec<T>* v) {
    Vec<T> t[n];
    for (int step = 1; step < n; step *= 2) {
        for (int i = 0; i < n / 2; ++i) {
            Vec<T> even = v[2 * i], odd = v[2 * i + 1];
            split(even, odd);
            t[i] = even, t[i + n / 2] = odd;
        }
        for (int i = 0; i < n; ++i) v[i] = t[i];
    }
}
template <int n, class T>
QORI_INLINE void joinAll(Vec<T>* v) {
    Vec<T> t[n];
    for (int step = 1; step < n; step *= 2) {
        for (int i = 0; i < n / 2; ++i) {
            Vec<T> even = v[i], odd = v[i + n / 2];
            join(even, odd);
            t[2 * i] = even, t[2 * i + 1] = odd;
        }
        for (int i = 0; i < n; ++i) v[i] = t[i];
    }
}

/// Of n vectors, a power of two up to kMost.
template <class T>
QORI_INLINE void fromRow(Vec<T>* v, int n) {
    switch (n) {
        case 2: return splitAll<2>(v);
        case 4: return splitAll<4>(v);
        case 8: return splitAll<8>(v);
        case 16: return splitAll<16>(v);
        default: return;
    }
}

/// Undoes it.
template <class T>
QORI_INLINE void toRow(Vec<T>* v, int n) {
    switch (n) {
        case 2: return joinAll<2>(v);
        case 4: return joinAll<4>(v);
        case 8: return joinAll<8>(v);
        case 16: return joinAll<16>(v);
        default: return;
    }
}

}  // namespace qori::kernels::planes
