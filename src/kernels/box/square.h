// SPDX-License-Identifier: Apache-2.0
// Three rows of bytes at a time, several windows below each other: the first half of the 3 x 3 box and of the 3 x 3
// Gauss. Sums in 16 bits: at most 4 * 255 here and 16 * 255 across.
#pragma once
#include "kernels/box/across.h"

namespace qori::kernels {

/// Weights of the rows above, at and below a pixel, and of its columns likewise.
enum class Square { ones, binomial };  ///< (1, 1, 1) or (1, 2, 1).

/// sums[k] of rows k, k + 1 and k + 2 of `src`, which has rows + 2 of them.
template <Square weights, int rows>
QORI_NOINLINE void sumThreeRows(const uint8_t* const* src, uint16_t* const* sums, ptrdiff_t elements) {
    const uint8_t* from[rows + 2];
    uint16_t* to[rows];
    for (int k = 0; k < rows + 2; ++k) from[k] = src[k];
    for (int k = 0; k < rows; ++k) to[k] = sums[k];
    forVectors<uint16_t>(elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
        const auto row = [&](int k) __attribute__((always_inline)) { return loadAs<uint16_t>(from[k] + i, count); };
        Vec<uint16_t> first = row(0), second = row(1);
        if constexpr (weights == Square::ones) {
            for (int k = 0; k < rows; k += 2) {
                const Vec<uint16_t> third = row(k + 2), fourth = row(k + 3), shared = second + third;
                storeUpTo(to[k] + i, first + shared, count);
                storeUpTo(to[k + 1] + i, shared + fourth, count);
                first = third;
                second = fourth;
            }
        } else {
            Vec<uint16_t> above = first + second;
            for (int k = 0; k < rows; ++k) {
                const Vec<uint16_t> third = row(k + 2), below = second + third;
                storeUpTo(to[k] + i, above + below, count);
                above = below;
                second = third;
            }
        }
    });
}

/// A sixteenth of the sums, to nearest, ties to even. Instructions round ties up: one less where the quotient is even,
/// which changes nothing else, and those go down. 16 * 255 < 2^15.
struct SixteenthOfBytes {
    QORI_INLINE static Vec<uint16_t> mean(Vec<uint16_t> s) {
        const __m256i even = _mm256_andnot_si256(_mm256_srli_epi16(s.v, 4), _mm256_set1_epi16(1));
        return {_mm256_mulhrs_epi16(_mm256_sub_epi16(s.v, even), _mm256_set1_epi16(2048))};
    }
    QORI_INLINE Bytes operator()(const Vec<uint16_t>* s, ptrdiff_t, ptrdiff_t) const {
        return {narrowSaturated<uint8_t>(Vec<int16_t>{mean(s[0]).v}, Vec<int16_t>{mean(s[1]).v}).v};
    }
};

/// dst[i] = rule of the three sums from sums[i] on, `channels` elements apart.
template <Square weights, int channels, bool keepAlpha, class T, class S, class Rule>
QORI_NOINLINE void acrossThree(const S* sums, T* dst, ptrdiff_t elements, Rule rule) {
    constexpr int vectors = kSumVectors<S, T>;
    forVectors<T>(elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
        Vec<S> total[vectors];
        for (int v = 0; v < vectors; ++v) {
            const ptrdiff_t rest = count - v * Vec<S>::lanes;
            const S* const from = sums + i + v * Vec<S>::lanes;
            const Vec<S> middle = loadUpTo(from + channels, rest);
            total[v] = loadUpTo(from, rest) + loadUpTo(from + 2 * channels, rest) + middle;
            if constexpr (weights == Square::binomial) total[v] = total[v] + middle;
        }
        storeMeans<keepAlpha>(dst + i, rule(total, i, count), count);
    });
}

}  // namespace qori::kernels
