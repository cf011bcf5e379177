// SPDX-License-Identifier: Apache-2.0
// Gauss of 5 x 5, and of 3 x 3 for elements of 16 bits and more: rows first, then columns.
//
//      2   7  12   7   2
//      7  31  52  31   7     The rows' sums are made three times, with the weights of the middle column, of those
//      beside
//     12  52 127  52  12     it and of those at the edge: (12, 52, 127, 52, 12), (7, 31, 52, 31, 7), (2, 7, 12, 7, 2).
//      7  31  52  31   7     Bytes: at most 255 * 255, 128 * 255 and 30 * 255, which 16 bits hold.
//      2   7  12   7   2     Words: 571 * 65,535 in all, which 32 bits hold.
#pragma once
#include "kernels/box/square.h"

namespace qori::kernels {

/// Weights of a column for the rows at a pixel, beside it and at the edge.
struct GaussColumn {
    int at, beside, edge;
};
inline constexpr GaussColumn kGaussColumns[3] = {{127, 52, 12}, {52, 31, 7}, {12, 7, 2}};
inline constexpr int kGaussTotal = 571;

namespace detail {

template <int factor, class S>
QORI_INLINE Vec<S> times(Vec<S> a) {
    if constexpr (std::is_same_v<S, float>)
        return {_mm256_mul_ps(a.v, _mm256_set1_ps(static_cast<float>(factor)))};
    else
        return {_mm256_mullo_epi32(a.v, _mm256_set1_epi32(factor))};
}

/// 32 bytes whose halves, interleaved with others' by unpacking, give 16 elements in order each.
QORI_INLINE __m256i loadForPairs(const uint8_t* p, ptrdiff_t count) {
    return _mm256_permute4x64_epi64(loadUpTo(p, count).v, 0xD8);
}

/// Two rows' weighted bytes: both weights below 128, so that the sum of two products stays below 2^15 where they add up
/// to 128 at most.
QORI_INLINE __m256i weigh(__m256i pairs, int first, int second) {
    return _mm256_maddubs_epi16(pairs, _mm256_set1_epi16(static_cast<int16_t>(second << 8 | first)));
}

}  // namespace detail

/// One row of each of the three sums.
template <class S>
struct GaussRows {
    S* column[3];
};

/// src: five rows from two above to two below.
QORI_NOINLINE inline void sumGaussRows(const uint8_t* const* src, GaussRows<uint16_t> sums, ptrdiff_t elements) {
    const uint8_t* const row[] = {src[0], src[1], src[2], src[3], src[4]};
    forVectors<uint8_t>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            __m256i r[5];
            for (int k = 0; k < 5; ++k) r[k] = detail::loadForPairs(row[k] + i, count);
            const __m256i zero = _mm256_setzero_si256();
            const __m256i edge[] = {_mm256_unpacklo_epi8(r[0], r[4]), _mm256_unpackhi_epi8(r[0], r[4])};
            const __m256i beside[] = {_mm256_unpacklo_epi8(r[1], r[3]), _mm256_unpackhi_epi8(r[1], r[3])};
            const __m256i at[] = {_mm256_unpacklo_epi8(r[2], zero), _mm256_unpackhi_epi8(r[2], zero)};
            for (int c = 0; c < 3; ++c)
                for (int half = 0; half < 2; ++half) {
                    const GaussColumn w = kGaussColumns[c];
                    const __m256i sum = _mm256_add_epi16(
                        _mm256_add_epi16(detail::weigh(edge[half], w.edge, w.edge), detail::weigh(at[half], w.at, 0)),
                        detail::weigh(beside[half], w.beside, w.beside));
                    storeUpTo(sums.column[c] + i + 16 * half, Vec<uint16_t>{sum}, count - 16 * half);
                }
        });
}

template <class S, class T>
QORI_NOINLINE void sumGaussRows(const T* const* src, GaussRows<S> sums, ptrdiff_t elements) {
    const T* const row[] = {src[0], src[1], src[2], src[3], src[4]};
    forVectors<S>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            using detail::times;
            const Vec<S> edge = loadAs<S>(row[0] + i, count) + loadAs<S>(row[4] + i, count);
            const Vec<S> beside = loadAs<S>(row[1] + i, count) + loadAs<S>(row[3] + i, count);
            const Vec<S> at = loadAs<S>(row[2] + i, count);
            storeUpTo(sums.column[0] + i, times<12>(edge) + times<52>(beside) + times<127>(at), count);
            storeUpTo(sums.column[1] + i, times<7>(edge) + times<31>(beside) + times<52>(at), count);
            storeUpTo(sums.column[2] + i, times<2>(edge) + times<7>(beside) + times<12>(at), count);
        });
}

/// Bytes: sum / 571 to nearest; 571 is odd and leaves no ties. The float product is off by less than 255 * 2^-23 =
/// 3.1e-5, and the quotient stays 1 / 1142 = 8.8e-4 from the half.
struct GaussMeanOfBytes {
    /// The middle, and the sums of both columns beside it and of both at the edge.
    QORI_INLINE Bytes operator()(const Vec<uint16_t>* middle, const Vec<uint16_t>* beside,
                                 const Vec<uint16_t>* edge) const {
        const __m256i zero = _mm256_setzero_si256(), exponent = _mm256_set1_epi16(kUnitsBits);
        const FloatMean mean(kGaussTotal);
        __m256i words[2];
        for (int k = 0; k < 2; ++k) {
            const __m256i low = _mm256_add_epi32(
                _mm256_add_epi32(_mm256_unpacklo_epi16(beside[k].v, zero), _mm256_unpacklo_epi16(edge[k].v, zero)),
                _mm256_unpacklo_epi16(middle[k].v, exponent));
            const __m256i high = _mm256_add_epi32(
                _mm256_add_epi32(_mm256_unpackhi_epi16(beside[k].v, zero), _mm256_unpackhi_epi16(edge[k].v, zero)),
                _mm256_unpackhi_epi16(middle[k].v, exponent));
            words[k] = _mm256_packs_epi32(mean.meanOfUnits(low), mean.meanOfUnits(high));
        }
        return {narrowSaturated<uint8_t>(Vec<int16_t>{words[0]}, Vec<int16_t>{words[1]}).v};
    }

private:
    static constexpr uint16_t kUnitsBits = detail::kUnitsBits;
};

/// dst[i] from the sums of the columns two pixels to the left (element i) to two to the right.
template <int channels, bool keepAlpha, class T, class S, class Rule>
QORI_NOINLINE void acrossGauss(GaussRows<S> sums, T* dst, ptrdiff_t elements, Rule rule) {
    constexpr int vectors = kSumVectors<S, T>;
    forVectors<T>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            Vec<S> middle[vectors], beside[vectors], edge[vectors];
            for (int v = 0; v < vectors; ++v) {
                const ptrdiff_t rest = count - v * Vec<S>::lanes, at = i + v * Vec<S>::lanes;
                middle[v] = loadUpTo(sums.column[0] + at + 2 * channels, rest);
                beside[v] =
                    loadUpTo(sums.column[1] + at + channels, rest) + loadUpTo(sums.column[1] + at + 3 * channels, rest);
                edge[v] = loadUpTo(sums.column[2] + at, rest) + loadUpTo(sums.column[2] + at + 4 * channels, rest);
            }
            if constexpr (std::is_same_v<Rule, GaussMeanOfBytes>) {
                storeMeans<keepAlpha>(dst + i, rule(middle, beside, edge), count);
            } else {
                for (int v = 0; v < vectors; ++v) middle[v] = middle[v] + (beside[v] + edge[v]);
                storeMeans<keepAlpha>(dst + i, rule(middle, i, count), count);
            }
        });
}

/// sums = above + 2 * at + below.
template <class S, class T>
QORI_NOINLINE void sumBinomialRows(const T* above, const T* at, const T* below, S* sums, ptrdiff_t elements) {
    forVectors<S>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            const Vec<S> middle = loadAs<S>(at + i, count);
            storeUpTo(sums + i, loadAs<S>(above + i, count) + loadAs<S>(below + i, count) + middle + middle, count);
        });
}

/// dst[i] = rule of sums[i] + 2 * sums[i + channels] + sums[i + 2 * channels].
template <int channels, bool keepAlpha, class T, class S, class Rule>
QORI_NOINLINE void acrossBinomial(const S* sums, T* dst, ptrdiff_t elements, Rule rule) {
    acrossSums<keepAlpha, S>(
        dst, elements, rule, [=](ptrdiff_t i, ptrdiff_t rest) __attribute__((always_inline)) {
            const S* const from = sums + i;
            const Vec<S> middle = loadUpTo(from + channels, rest);
            return loadUpTo(from, rest) + loadUpTo(from + 2 * channels, rest) + middle + middle;
        });
}

}  // namespace qori::kernels
