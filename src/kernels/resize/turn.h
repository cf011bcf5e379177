// SPDX-License-Identifier: Apache-2.0
// Turning blocks of floats: rows become columns.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

/// Within each half, rows become columns: v[j] holds element j of all four in its low half, element 4 + j in its high.
QORI_INLINE void turnQuads(__m256 v[4]) {
    const __m256 a = _mm256_unpacklo_ps(v[0], v[1]), b = _mm256_unpackhi_ps(v[0], v[1]);
    const __m256 c = _mm256_unpacklo_ps(v[2], v[3]), d = _mm256_unpackhi_ps(v[2], v[3]);
    v[0] = _mm256_shuffle_ps(a, c, 0x44);
    v[1] = _mm256_shuffle_ps(a, c, 0xEE);
    v[2] = _mm256_shuffle_ps(b, d, 0x44);
    v[3] = _mm256_shuffle_ps(b, d, 0xEE);
}

/// Turns four elements of eight rows, load4(i) of row i, into four vectors of a column each.
template <class Load>
QORI_INLINE void turnFours(Load load4, float* out) {
    __m256 v[4];
    for (int j = 0; j < 4; ++j) v[j] = _mm256_insertf128_ps(_mm256_castps128_ps256(load4(j)), load4(4 + j), 1);
    turnQuads(v);
    for (int j = 0; j < 4; ++j) _mm256_storeu_ps(out + 8 * j, v[j]);
}

QORI_INLINE void turnFloats(const float* const rows[8], ptrdiff_t at, float* out) {
    turnFours([=](int i) { return _mm_loadu_ps(rows[i] + at); }, out);
}

}  // namespace qori::kernels
