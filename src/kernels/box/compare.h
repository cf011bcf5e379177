// SPDX-License-Identifier: Apache-2.0
// Pixels against the mean of their neighbourhood: by exact sums, or by weighted means in single precision.
#pragma once
#include "kernels/box/across.h"

namespace qori::kernels {

/// What a comparison writes.
struct TwoValues {
    uint8_t greater, rest;
};

namespace detail {

/// Four vectors of lanes that are all ones or zeros, as bytes in order.
QORI_INLINE Mask<uint8_t> packMasks(const __m256i* v) {
    const __m256i packed = _mm256_packs_epi16(_mm256_packs_epi32(v[0], v[1]), _mm256_packs_epi32(v[2], v[3]));
    return {_mm256_permutevar8x32_epi32(packed, _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7))};
}

/// `count` of 32 pixels, in four vectors of 8.
QORI_INLINE void splitPixels(const uint8_t* src, ptrdiff_t count, __m256i* v) {
    const __m256i all = loadUpTo(src, count).v;
    const __m128i low = _mm256_castsi256_si128(all), high = _mm256_extracti128_si256(all, 1);
    v[0] = _mm256_cvtepu8_epi32(low);
    v[1] = _mm256_cvtepu8_epi32(_mm_srli_si128(low, 8));
    v[2] = _mm256_cvtepu8_epi32(high);
    v[3] = _mm256_cvtepu8_epi32(_mm_srli_si128(high, 8));
}

QORI_INLINE void storeChosen(uint8_t* dst, const __m256i* greater, TwoValues values, ptrdiff_t count) {
    storeUpTo(dst, select(packMasks(greater), splat(values.greater), splat(values.rest)), count);
}

}  // namespace detail

/// src > sum / area - delta, which is sum < src * area + delta * area: `excess` is the latter rounded up. All of them
/// below 2^31: area <= 2^22.
QORI_NOINLINE inline void compareSums(const uint8_t* src, const uint32_t* sums, int32_t area, int32_t excess,
                                      uint8_t* dst, TwoValues values, ptrdiff_t elements) {
    forVectors<uint8_t>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            __m256i v[4];
            detail::splitPixels(src + i, count, v);
            for (int k = 0; k < 4; ++k) {
                const __m256i limit =
                    _mm256_add_epi32(_mm256_mullo_epi32(v[k], _mm256_set1_epi32(area)), _mm256_set1_epi32(excess));
                v[k] = _mm256_cmpgt_epi32(limit, loadUpTo(sums + i + 8 * k, count - 8 * k).v);
            }
            detail::storeChosen(dst + i, v, values, count);
        });
}

/// line[i] = src[i].
QORI_NOINLINE inline void floatsOfBytes(const uint8_t* src, float* line, ptrdiff_t elements) {
    forVectors<float>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            storeUpTo(line + i, Vec<float>{_mm256_cvtepi32_ps(loadAs<uint32_t>(src + i, count).v)}, count);
        });
}

/// sums[i] = weight[0] * line[i] + weight[1] * line[i + 1] + ..., in fused multiply-adds from the left.
QORI_NOINLINE inline void weighAlong(const float* line, const float* weight, ptrdiff_t taps, float* sums,
                                     ptrdiff_t elements) {
    forVectors<uint8_t>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            __m256 sum[4];
            for (int v = 0; v < 4; ++v) sum[v] = _mm256_setzero_ps();
            for (ptrdiff_t k = 0; k < taps; ++k) {
                const __m256 w = _mm256_broadcast_ss(weight + k);
                for (int v = 0; v < 4; ++v)
                    sum[v] = _mm256_fmadd_ps(w, loadUpTo(line + i + k + 8 * v, count - 8 * v).v, sum[v]);
            }
            for (int v = 0; v < 4; ++v) storeUpTo(sums + i + 8 * v, Vec<float>{sum[v]}, count - 8 * v);
        });
}

/// Rows that follow each other in a ring.
struct FloatRing {
    const float* begin;
    const float* end;
    ptrdiff_t pitch;
};

/// src > weighted mean of the columns - delta, for a row and the one below it; the window of the upper one begins with
/// row `first` in the ring. Each row of the ring is loaded once for both. Where both have the same destination, the
/// upper one counts.
QORI_NOINLINE inline void compareWeighed(const uint8_t* const* src, FloatRing ring, const float* first,
                                         const float* weight, ptrdiff_t taps, float delta, uint8_t* const* dst,
                                         TwoValues values, ptrdiff_t elements) {
    const ptrdiff_t all = ring.end - ring.begin;
    forVectors<uint8_t>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            const float* row = first + i;
            const float* const end = ring.end + i;
            __m256 mean[2][4];
            for (int v = 0; v < 8; ++v) mean[v / 4][v % 4] = _mm256_setzero_ps();
            const auto add = [&](__m256 * sums, const float* w) __attribute__((always_inline)) {
                const __m256 factor = _mm256_broadcast_ss(w);
                for (int v = 0; v < 4; ++v)
                    sums[v] = _mm256_fmadd_ps(factor, loadUpTo(row + 8 * v, count - 8 * v).v, sums[v]);
            };
            const auto next = [&]() __attribute__((always_inline)) {
                row += ring.pitch;
                if (row >= end) row -= all;
            };
            add(mean[0], weight);
            next();
            for (ptrdiff_t k = 1; k < taps; ++k, next()) {
                add(mean[0], weight + k);
                add(mean[1], weight + k - 1);
            }
            add(mean[1], weight + taps - 1);
            __m256i greater[2][4];  // of both before either is stored, which may be the source
            for (int lower = 0; lower < 2; ++lower) {
                detail::splitPixels(src[lower] + i, count, greater[lower]);
                for (int k = 0; k < 4; ++k) {
                    const __m256 limit = _mm256_sub_ps(mean[lower][k], _mm256_set1_ps(delta));
                    const __m256 pixels = _mm256_cvtepi32_ps(greater[lower][k]);
                    greater[lower][k] = _mm256_castps_si256(_mm256_cmp_ps(pixels, limit, _CMP_GT_OQ));
                }
            }
            for (int lower = 1; lower >= 0; --lower) detail::storeChosen(dst[lower] + i, greater[lower], values, count);
        });
}

/// All elements the same.
inline void fillBytes(uint8_t* dst, uint8_t value, ptrdiff_t elements) {
    forVectors<uint8_t>(elements, [&](ptrdiff_t i, auto count) { storeUpTo(dst + i, splat(value), count); });
}

}  // namespace qori::kernels
