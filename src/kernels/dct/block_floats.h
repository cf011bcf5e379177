// SPDX-License-Identifier: Apache-2.0
// The 8x8 cosine transform of floats. A vector holds one row: passes down columns go lane by lane, and between the two
// the block is turned. Default control is expected.
#pragma once
#include "cosines.h"
#include "kernels/resize/turn.h"
#include "kernels/simd.h"

namespace qori::kernels::dct8 {

/// A row of the block per vector.
using FloatRows = __m256[8];

struct ScaleTable {
    alignas(kVectorBytes) float at[64];

    constexpr ScaleTable() : at() {
        for (int v = 0; v < 8; ++v)
            for (int u = 0; u < 8; ++u) at[8 * v + u] = static_cast<float>(weightOf(u) * weightOf(v) / 4);
    }
};
/// What a coefficient of the factored transform is multiplied with: s(u) s(v), s(k) = weight(k) / 2.
inline constexpr ScaleTable kScale;

QORI_INLINE void scaleRows(FloatRows& x) {
    for (int i = 0; i < 8; ++i) x[i] = _mm256_mul_ps(x[i], _mm256_load_ps(kScale.at + 8 * i));
}

QORI_INLINE __m256 splatFloat(double value) { return _mm256_set1_ps(static_cast<float>(value)); }

/// Sums of pixels down columns become frequencies, without their weights.
QORI_INLINE void forwardFloatColumns(FloatRows& x) {
    const __m256 t1 = splatFloat(kTangent1), t2 = splatFloat(kTangent2), t3 = splatFloat(kTangent3);
    const __m256 half = splatFloat(kCosine[4]);
    __m256 s[4], d[4];
    for (int i = 0; i < 4; ++i) {
        s[i] = _mm256_add_ps(x[i], x[7 - i]);
        d[i] = _mm256_sub_ps(x[i], x[7 - i]);
    }
    const __m256 e0 = _mm256_add_ps(s[0], s[3]), e1 = _mm256_add_ps(s[1], s[2]);
    const __m256 e2 = _mm256_sub_ps(s[1], s[2]), e3 = _mm256_sub_ps(s[0], s[3]);
    x[0] = _mm256_add_ps(e0, e1);
    x[4] = _mm256_sub_ps(e0, e1);
    x[2] = _mm256_fmadd_ps(t2, e2, e3);
    x[6] = _mm256_fmsub_ps(t2, e3, e2);
    const __m256 sum = _mm256_add_ps(d[1], d[2]), difference = _mm256_sub_ps(d[1], d[2]);
    const __m256 a = _mm256_fmadd_ps(half, sum, d[0]), b = _mm256_fnmadd_ps(half, sum, d[0]);
    const __m256 c = _mm256_fmadd_ps(half, difference, d[3]), e = _mm256_fnmadd_ps(half, difference, d[3]);
    x[1] = _mm256_fmadd_ps(t1, c, a);
    x[7] = _mm256_fmsub_ps(t1, a, c);
    x[3] = _mm256_fnmadd_ps(t3, e, b);
    x[5] = _mm256_fmadd_ps(t3, b, e);
}

/// The transpose of the forward pass: weighted frequencies become pixels.
QORI_INLINE void inverseFloatColumns(FloatRows& x) {
    const __m256 t1 = splatFloat(kTangent1), t2 = splatFloat(kTangent2), t3 = splatFloat(kTangent3);
    const __m256 half = splatFloat(kCosine[4]);
    const __m256 e0 = _mm256_add_ps(x[0], x[4]), e1 = _mm256_sub_ps(x[0], x[4]);
    const __m256 f0 = _mm256_fmadd_ps(t2, x[6], x[2]), f1 = _mm256_fmsub_ps(t2, x[2], x[6]);
    const __m256 even[4] = {_mm256_add_ps(e0, f0), _mm256_add_ps(e1, f1), _mm256_sub_ps(e1, f1), _mm256_sub_ps(e0, f0)};
    const __m256 a = _mm256_fmadd_ps(t1, x[7], x[1]), c = _mm256_fmsub_ps(t1, x[1], x[7]);
    const __m256 b = _mm256_fmadd_ps(t3, x[5], x[3]), d = _mm256_fnmadd_ps(t3, x[3], x[5]);
    const __m256 g = _mm256_sub_ps(a, b), h = _mm256_sub_ps(c, d);
    const __m256 odd[4] = {_mm256_add_ps(a, b), _mm256_add_ps(g, h), _mm256_sub_ps(g, h), _mm256_add_ps(c, d)};
    x[0] = _mm256_add_ps(even[0], odd[0]);
    x[7] = _mm256_sub_ps(even[0], odd[0]);
    x[1] = _mm256_fmadd_ps(half, odd[1], even[1]);
    x[6] = _mm256_fnmadd_ps(half, odd[1], even[1]);
    x[2] = _mm256_fmadd_ps(half, odd[2], even[2]);
    x[5] = _mm256_fnmadd_ps(half, odd[2], even[2]);
    x[3] = _mm256_add_ps(even[3], odd[3]);
    x[4] = _mm256_sub_ps(even[3], odd[3]);
}

/// Columns of a block in memory: element j of all rows in x[j].
QORI_INLINE void loadTurned(const float* block, FloatRows& x) {
    for (int half = 0; half < 2; ++half) {
        for (int j = 0; j < 4; ++j) {
            const float* const row = block + 8 * j + 4 * half;
            x[4 * half + j] =
                _mm256_insertf128_ps(_mm256_castps128_ps256(_mm_loadu_ps(row)), _mm_loadu_ps(row + 32), 1);
        }
        turnQuads(x + 4 * half);
    }
}

QORI_INLINE void turnRows(FloatRows& x) {
    for (int j = 0; j < 4; ++j) {
        const __m256 low = x[j], high = x[4 + j];
        x[j] = _mm256_permute2f128_ps(low, high, 0x20);
        x[4 + j] = _mm256_permute2f128_ps(low, high, 0x31);
    }
    turnQuads(x);
    turnQuads(x + 4);
}

/// From registers: the compiler else sees a copy of memory, which it makes by way of general registers.
QORI_INLINE void storeFloatRows(const FloatRows& x, float* block) {
    for (int i = 0; i < 8; ++i) {
        __m256 row = x[i];
        __asm__("" : "+x"(row));
        _mm256_storeu_ps(block + 8 * i, row);
    }
}

/// dst may be src.
QORI_INLINE void forwardFloats(const float* src, float* dst) {
    FloatRows x;
    loadTurned(src, x);
    forwardFloatColumns(x);
    turnRows(x);
    forwardFloatColumns(x);
    scaleRows(x);
    storeFloatRows(x, dst);
}

/// What pairs of a row's coefficients become: for 2 k and 2 k + 1 their cosines at pixels 0 to 3 in turn, halved, the
/// first one's by cos(pi / 4), and times what the pass down columns takes for its weight: weightOf(v) / 2.
struct PairTable {
    alignas(kVectorBytes) float at[4][4][8];  ///< Of v from 0 to 3, then k.

    constexpr PairTable() : at() {
        for (int v = 0; v < 4; ++v)
            for (int k = 0; k < 4; ++k)
                for (int i = 0; i < 8; ++i) {
                    const int u = 2 * k + i % 2;
                    const double cosine = cosineOf((2 * (i / 2) + 1) * u);
                    at[v][k][i] = static_cast<float>((u == 0 ? kCosine[4] : cosine) * weightOf(v) / 4);
                }
    }
};
inline constexpr PairTable kPairs;

/// Row v of coefficients to sums of the even ones and of the odd ones in turn, at pixels 0 to 3. Pairs come from memory
/// to all lanes, so that nothing is turned.
QORI_INLINE __m256 inverseFloatRow(const float* row, const float (&pairs)[4][8]) {
    __m256 sum = _mm256_setzero_ps();
    for (int k = 0; k < 4; ++k) {
        double coefficients;
        __builtin_memcpy(&coefficients, row + 2 * k, sizeof(coefficients));
        const __m256 pair = _mm256_castpd_ps(_mm256_set1_pd(coefficients));
        const __m256 cosines = _mm256_load_ps(pairs[k]);
        sum = k == 0 ? _mm256_mul_ps(pair, cosines) : _mm256_fmadd_ps(pair, cosines, sum);
    }
    return sum;
}

/// dst may be src.
QORI_INLINE void inverseFloats(const float* src, float* dst) {
    FloatRows x;
    for (int v = 0; v < 8; ++v) x[v] = inverseFloatRow(src + 8 * v, kPairs.at[v < 4 ? v : (8 - v) % 4]);
    inverseFloatColumns(x);
    // Differences, of pixels 7 to 4, then sums.
    const __m256i order = _mm256_setr_epi32(1, 3, 5, 7, 6, 4, 2, 0);
    for (__m256& row : x) row = _mm256_permutevar8x32_ps(_mm256_addsub_ps(row, _mm256_permute_ps(row, 0xB1)), order);
    storeFloatRows(x, dst);
}

// --- words by way of floats -----------------------------------------------------------------------------------------

inline void widenWords(const int16_t* words, float* floats) {
    for (int i = 0; i < 64; i += 8) {
        const __m128i row = _mm_loadu_si128(reinterpret_cast<const __m128i*>(words + i));
        _mm256_storeu_ps(floats + i, _mm256_cvtepi32_ps(_mm256_cvtepi16_epi32(row)));
    }
}

/// To nearest, halves up, saturated. Elements are below 2^22 in magnitude, so that the sum with 1/2 is exact wherever
/// it decides.
inline void roundWords(const float* floats, int16_t* words) {
    for (int i = 0; i < 64; i += 16) {
        const auto rounded = [=](int at) {
            const __m256 raised = _mm256_add_ps(_mm256_loadu_ps(floats + at), _mm256_set1_ps(0.5f));
            return _mm256_cvttps_epi32(_mm256_floor_ps(raised));
        };
        const __m256i packed = _mm256_packs_epi32(rounded(i), rounded(i + 8));
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(words + i), _mm256_permute4x64_epi64(packed, 0xD8));
    }
}

/// Any words. A coefficient is below 2^18 before it is saturated, its error below 2^-4. dst may be src.
inline void forwardWide(const int16_t* src, int16_t* dst) {
    float block[64];
    widenWords(src, block);
    forwardFloats(block, block);
    roundWords(block, dst);
}

/// As forwardWide, of coefficients.
inline void inverseWide(const int16_t* src, int16_t* dst) {
    float block[64];
    widenWords(src, block);
    inverseFloats(block, block);
    roundWords(block, dst);
}

}  // namespace qori::kernels::dct8
