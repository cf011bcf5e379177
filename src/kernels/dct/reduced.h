// SPDX-License-Identifier: Apache-2.0
// Inverses of blocks whose coefficients are zero but for the lowest, and inverses that make fewer pixels of these.
#pragma once
#include "block_floats.h"
#include "block_words.h"

namespace qori::kernels::dct8 {

// --- all pixels -----------------------------------------------------------------------------------------------------

/// Products along two rows, of their first four elements: parts 0 and 2 of the tables of both.
constexpr RowWeights lowWeights(int j, int otherJ) {
    const RowWeights first = inverseWeights(j), second = inverseWeights(otherJ);
    RowWeights weights{};
    for (int part = 0; part < 4; ++part)
        for (int i = 0; i < 16; ++i) weights.pairs[part][i] = (i < 8 ? first : second).pairs[part][i];
    return weights;
}
inline constexpr RowWeights kLowWeights[2] = {lowWeights(4, 2), lowWeights(1, 3)};  // rows 0 and 2, 1 and 3
inline constexpr RowWeights kLowestWeights = lowWeights(4, 1);                      // rows 0 and 1

/// As inverseRows where elements from the fifth on are zero.
QORI_INLINE __m256i inverseLowRows(__m256i rows, const RowWeights& weights, __m256i rounding) {
    const auto products = [&](int word, int part) {
        const auto both = static_cast<int64_t>(shuffleOfWords(word, word + 2, word, word + 2));
        return _mm256_madd_epi16(_mm256_shuffle_epi8(rows, _mm256_set1_epi64x(both)), weightPairs(weights, part));
    };
    const __m256i even = _mm256_add_epi32(products(0, 0), rounding), odd = products(1, 2);
    const __m256i low = _mm256_srai_epi32(_mm256_add_epi32(even, odd), kRowShift);
    const __m256i high = _mm256_srai_epi32(_mm256_sub_epi32(even, odd), kRowShift);
    return _mm256_shufflehi_epi16(_mm256_packs_epi32(low, high), 0x1B);
}

QORI_INLINE PixelRows sumsAndDifferences(const __m128i (&even)[4], const __m128i (&odd)[4]) {
    const __m256i even01 = pairOf(even[0], even[1]), even32 = pairOf(even[3], even[2]);
    const __m256i odd01 = pairOf(odd[0], odd[1]), odd32 = pairOf(odd[3], odd[2]);
    return {{_mm256_adds_epi16(even01, odd01), _mm256_subs_epi16(even01, odd01), _mm256_adds_epi16(even32, odd32),
             _mm256_subs_epi16(even32, odd32)}};
}

/// The first n coefficients of each of the first n rows, n = 2 or 4; others are not read. The steps are those of
/// inverseWords, so that the pixels are too. False where the block wants more than 16-bit lanes.
template <int n>
QORI_INLINE bool inverseLowWords(const int16_t* src, PixelRows& pixels) {
    static_assert(n == 2 || n == 4);
    const __m128i t1 = _mm_set1_epi16(q15(kTangent1)), t2 = _mm_set1_epi16(q15(kTangent2));
    const __m128i t3 = _mm_set1_epi16(q15(kTangent3)), half = _mm_set1_epi16(q15(kCosine[4]));
    const auto loadLow = [=](int row) {
        const int16_t* const p = src + 8 * row;
        return n == 4 ? _mm_loadl_epi64(reinterpret_cast<const __m128i*>(p)) : _mm_loadu_si32(p);
    };
    if constexpr (n == 4) {
        const __m256i rows02 = pairOf(loadLow(0), loadLow(2)), rows13 = pairOf(loadLow(1), loadLow(3));
        const __m256i made02 = inverseLowRows(rows02, kLowWeights[0], inverseRounding(true));
        const __m256i made13 = inverseLowRows(rows13, kLowWeights[1], inverseRounding(false));
        const __m128i r0 = _mm256_castsi256_si128(made02), r2 = _mm256_extracti128_si256(made02, 1);
        const __m128i r1 = _mm256_castsi256_si128(made13), r3 = _mm256_extracti128_si256(made13, 1);
        const __m128i f = _mm_mulhrs_epi16(r2, t2), c = _mm_mulhrs_epi16(r1, t1), d = _mm_mulhrs_epi16(r3, t3);
        const __m128i g = _mm_subs_epi16(r1, r3), h = _mm_adds_epi16(c, d);
        pixels = sumsAndDifferences(
            {_mm_adds_epi16(r0, r2), _mm_adds_epi16(r0, f), _mm_subs_epi16(r0, f), _mm_subs_epi16(r0, r2)},
            {_mm_adds_epi16(r1, r3), _mm_mulhrs_epi16(_mm_adds_epi16(g, h), half),
             _mm_mulhrs_epi16(_mm_subs_epi16(g, h), half), _mm_subs_epi16(c, d)});
        return finishPixels(_mm256_or_si256(_mm256_abs_epi16(rows02), _mm256_abs_epi16(rows13)), pixels);
    } else {
        const __m256i rows = pairOf(loadLow(0), loadLow(1));
        const __m256i made = inverseLowRows(rows, kLowestWeights, inverseRounding(true));
        const __m128i r0 = _mm256_castsi256_si128(made), r1 = _mm256_extracti128_si256(made, 1);
        const __m128i c = _mm_mulhrs_epi16(r1, t1);
        pixels = sumsAndDifferences({r0, r0, r0, r0}, {r1, _mm_mulhrs_epi16(_mm_adds_epi16(r1, c), half),
                                                       _mm_mulhrs_epi16(_mm_subs_epi16(r1, c), half), c});
        return finishPixels(_mm256_abs_epi16(rows), pixels);
    }
}

/// As inverseWide of the first n coefficients of each of the first n rows.
template <int n>
inline void inverseLowWide(const int16_t* src, int16_t* dst) {
    int16_t block[64] = {};
    for (int v = 0; v < n; ++v)
        for (int u = 0; u < n; ++u) block[8 * v + u] = src[8 * v + u];
    inverseWide(block, dst);
}

// --- fewer pixels ---------------------------------------------------------------------------------------------------

/// Four frequencies down columns to four pixels, times the square root of 8.
QORI_INLINE void inverseFourColumns(__m128 (&x)[4]) {
    constexpr double kRootOfTwo = 2 * kCosine[4];
    const __m128 more = _mm_set1_ps(static_cast<float>(kRootOfTwo * kCosine[2]));
    const __m128 less = _mm_set1_ps(static_cast<float>(kRootOfTwo * kCosine[6]));
    const __m128 e0 = _mm_add_ps(x[0], x[2]), e1 = _mm_sub_ps(x[0], x[2]);
    const __m128 o0 = _mm_fmadd_ps(more, x[1], _mm_mul_ps(less, x[3]));
    const __m128 o1 = _mm_fmsub_ps(less, x[1], _mm_mul_ps(more, x[3]));
    x[0] = _mm_add_ps(e0, o0);
    x[1] = _mm_add_ps(e1, o1);
    x[2] = _mm_sub_ps(e1, o1);
    x[3] = _mm_sub_ps(e0, o0);
}

/// 4x4 pixels, row by row, each the mean of 2x2 as far as the lowest 4x4 coefficients tell. To nearest, halves up. dst
/// may be src. Default control is expected.
inline void inverseToFour(const int16_t* src, int16_t* dst) {
    __m128 x[4];
    for (int i = 0; i < 4; ++i) {
        const __m128i row = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(src + 8 * i));
        x[i] = _mm_cvtepi32_ps(_mm_cvtepi16_epi32(row));
    }
    inverseFourColumns(x);
    _MM_TRANSPOSE4_PS(x[0], x[1], x[2], x[3]);
    inverseFourColumns(x);
    _MM_TRANSPOSE4_PS(x[0], x[1], x[2], x[3]);
    const auto rounded = [&](int row) {
        const __m128 raised = _mm_fmadd_ps(x[row], _mm_set1_ps(0.125f), _mm_set1_ps(0.5f));
        return _mm_cvttps_epi32(_mm_floor_ps(raised));
    };
    for (int i = 0; i < 4; i += 2)
        _mm_storeu_si128(reinterpret_cast<__m128i*>(dst + 4 * i), _mm_packs_epi32(rounded(i), rounded(i + 1)));
}

/// 2x2 pixels, row by row, each the mean of 4x4 as far as the lowest 2x2 coefficients tell. To nearest, halves up. dst
/// may be src.
inline void inverseToTwo(const int16_t* src, int16_t* dst) {
    const int a = src[0], b = src[1], c = src[8], d = src[9];
    const int pixels[4] = {a + b + c + d, a - b + c - d, a + b - c - d, a - b - c + d};
    for (int i = 0; i < 4; ++i) dst[i] = static_cast<int16_t>((pixels[i] + 4) >> 3);
}

}  // namespace qori::kernels::dct8
