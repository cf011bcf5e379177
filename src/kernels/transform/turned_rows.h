// SPDX-License-Identifier: Apache-2.0
// Eight rows of an image as vectors whose lanes are rows.
#pragma once
#include "move_lines.h"

namespace qori::kernels::line {

/// Within each half, four vectors' columns become rows.
QORI_INLINE void turnHalves(Vec<float> (&v)[4]) {
    const __m256 a = _mm256_unpacklo_ps(v[0].v, v[1].v), b = _mm256_unpackhi_ps(v[0].v, v[1].v);
    const __m256 c = _mm256_unpacklo_ps(v[2].v, v[3].v), d = _mm256_unpackhi_ps(v[2].v, v[3].v);
    v[0] = {_mm256_shuffle_ps(a, c, 0x44)};
    v[1] = {_mm256_shuffle_ps(a, c, 0xEE)};
    v[2] = {_mm256_shuffle_ps(b, d, 0x44)};
    v[3] = {_mm256_shuffle_ps(b, d, 0xEE)};
}

/// Eight rows of floats, by value: what is written through them does not change where they are.
struct EightRows {
    uint8_t* first;
    ptrdiff_t step;

    explicit EightRows(const LineRows& rows) : first(rows.first), step(rows.step) {}
    QORI_INLINE float* at(ptrdiff_t y, ptrdiff_t e) const { return reinterpret_cast<float*>(first + y * step) + e; }
};

/// Elements e to e + 3 of eight rows, in four vectors whose lanes are rows; and back. Halves hold rows 0 to 3 and 4
/// to 7.
QORI_INLINE void loadTurned(EightRows rows, ptrdiff_t e, Vec<float> (&v)[4]) {
    for (int i = 0; i < 4; ++i)
        v[i] = {_mm256_insertf128_ps(_mm256_castps128_ps256(_mm_loadu_ps(rows.at(i, e))),
                                     _mm_loadu_ps(rows.at(i + 4, e)), 1)};
    turnHalves(v);
}
QORI_INLINE void storeTurned(EightRows rows, ptrdiff_t e, Vec<float> (&v)[4]) {
    turnHalves(v);
    for (int i = 0; i < 4; ++i) {
        _mm_storeu_ps(rows.at(i, e), _mm256_castps256_ps128(v[i].v));
        _mm_storeu_ps(rows.at(i + 4, e), _mm256_extractf128_ps(v[i].v, 1));
    }
}

/// Whether eight rows lie there of which everything is read and written.
inline bool isPlain(const LineRows& rows) { return rows.count >= kLineColumns && rows.channels == rows.processed; }

}  // namespace qori::kernels::line
