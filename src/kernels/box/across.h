// SPDX-License-Identifier: Apache-2.0
// Windows along a row of column sums. Narrow ones are added up from shifted rows; wide ones of integers run along the
// row: the window's sum changes by what enters minus what leaves, and a vector of changes is added up in its lanes.
#pragma once
#include "kernels/box/means.h"
#include "kernels/map.h"

namespace qori::kernels {

template <bool keepAlpha, class T>
QORI_INLINE void storeMeans(T* to, Vec<T> means, ptrdiff_t count) {
    if constexpr (keepAlpha) means = detail::withAlphaOf(means, loadUpTo(to, count));
    storeUpTo(to, means, count);
}

/// dst[i] = rule of the sums sumAt(i, count) of count elements.
template <bool keepAlpha, class S, class T, class Rule, class SumAt>
QORI_INLINE void acrossSums(T* dst, ptrdiff_t elements, Rule rule, SumAt sumAt) {
    constexpr int vectors = kSumVectors<S, T>;
    forVectors<T>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            Vec<S> total[vectors];
            for (int v = 0; v < vectors; ++v)
                total[v] = sumAt(i + v * Vec<S>::lanes, count - v * ptrdiff_t{Vec<S>::lanes});
            storeMeans<keepAlpha>(dst + i, rule(total, i, count), count);
        });
}

/// dst[i] = rule of term[0][i] + term[1][i] + ... The terms lie `pitch` elements apart from `sums` on; `terms` of them,
/// or as many as `count` says where that is 0.
template <int terms, bool keepAlpha, class S, class T, class Rule>
QORI_NOINLINE void acrossTerms(const S* sums, ptrdiff_t pitch, ptrdiff_t many, T* dst, ptrdiff_t elements, Rule rule) {
    acrossSums<keepAlpha, S>(
        dst, elements, rule, [=](ptrdiff_t i, ptrdiff_t rest) __attribute__((always_inline)) {
            Vec<S> total = loadUpTo(sums + i, rest);
            const ptrdiff_t last = terms == 0 ? many : terms;
            for (ptrdiff_t k = 1; k < last; ++k) total = total + loadUpTo(sums + i + k * pitch, rest);
            return total;
        });
}

/// As acrossTerms; the terms lie where they like.
template <int terms, bool keepAlpha, class S, class T, class Rule>
QORI_NOINLINE void acrossChain(const S* const* term, int many, T* dst, ptrdiff_t elements, Rule rule) {
    const int last = terms == 0 ? many : terms;
    const S* from[terms == 0 ? kMostTerms : terms];
    for (int k = 0; k < last; ++k) from[k] = term[k];
    acrossSums<keepAlpha, S>(
        dst, elements, rule, [&](ptrdiff_t i, ptrdiff_t rest) __attribute__((always_inline)) {
            Vec<S> total = loadUpTo(from[0] + i, rest);
            for (int k = 1; k < last; ++k) total = total + loadUpTo(from[k] + i, rest);
            return total;
        });
}

namespace detail {

/// What the sums of the windows that begin at these columns change by from one column before: what enters minus what
/// leaves. `narrow`: 16 bits hold differences.
template <bool narrow, class S>
QORI_INLINE Vec<uint32_t> changes(const S* leaving, ptrdiff_t span, ptrdiff_t count) {
    if constexpr (narrow) {
        const auto half = [=](const S* p) __attribute__((always_inline)) {
            return loadBytes<16>(p, count * static_cast<ptrdiff_t>(sizeof(S)));
        };
        return {_mm256_cvtepi16_epi32(_mm_sub_epi16(half(leaving + span), half(leaving)))};
    } else {
        return loadAs<uint32_t>(leaving + span, count) - loadAs<uint32_t>(leaving, count);
    }
}

/// Per channel, the sum of `columns` pixels, in the lanes of the first vector of a row.
template <int channels, class S>
QORI_INLINE Vec<uint32_t> firstSums(const S* sums, ptrdiff_t columns) {
    // The vectors of three repeat their channels, lane by lane.
    constexpr int kTurn = channels == 3 ? 3 : 1;
    const ptrdiff_t elements = columns * channels;
    Vec<uint32_t> turn[kTurn] = {};
    for (ptrdiff_t i = 0; i < elements; i += 8 * kTurn)
        for (int v = 0; v < kTurn; ++v)
            if (const ptrdiff_t at = i + 8 * v, count = elements - at < 8 ? elements - at : 8; count > 0)
                turn[v] = turn[v] + selectOrZero(firstLanes<uint32_t>(count), loadAs<uint32_t>(sums + at, count));
    alignas(kVectorBytes) uint32_t lanes[8 * kTurn], total[8] = {};
    for (int v = 0; v < kTurn; ++v) store(lanes + 8 * v, turn[v]);
    for (int i = 0; i < 8 * kTurn; ++i) total[i % channels] += lanes[i];
    for (int i = channels; i < 8; ++i) total[i] = total[i - channels];
    return load(total);
}

/// Even and odd sums of 16 windows each, and 16 more, to bytes in order.
QORI_INLINE Bytes packPairs(__m256i even0, __m256i odd0, __m256i even1, __m256i odd1) {
    const __m256i packed = _mm256_packus_epi16(_mm256_packs_epi32(even0, odd0), _mm256_packs_epi32(even1, odd1));
    const __m256i order =
        _mm256_broadcastsi128_si256(_mm_setr_epi8(0, 4, 1, 5, 2, 6, 3, 7, 8, 12, 9, 13, 10, 14, 11, 15));
    return {_mm256_permute4x64_epi64(_mm256_shuffle_epi8(packed, order), 0xD8)};
}

}  // namespace detail

/// Windows of `span` elements, each one pixel further: dst[i] from the window that begins a pixel behind leaving + i.
/// carry: the window's sum that begins at `leaving`, per lane of its channel.
template <int channels, bool keepAlpha, bool narrow, class S, class T, class Rule>
QORI_NOINLINE void runAlong(const S* leaving, ptrdiff_t span, Vec<uint32_t> carry, T* dst, ptrdiff_t elements,
                            Rule rule) {
    constexpr int vectors = kSumVectors<uint32_t, T>;
    forVectors<T>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            Vec<uint32_t> total[vectors];
            for (int v = 0; v < vectors; ++v) {
                const ptrdiff_t rest = count - v * 8;
                const Vec<uint32_t> change =
                    rest > 0 ? detail::changes<narrow>(leaving + i + v * 8, span, rest < 8 ? rest : 8)
                             : zero<uint32_t>();
                total[v] = sumsUpTo<channels>(change) + carry;
                carry = lastOfChannels<channels>(total[v]);
            }
            storeMeans<keepAlpha>(dst + i, rule(total, i, count), count);
        });
}

/// dst[i] = rule of the window of `columns` pixels that begins at sums + i. One pixel of zeros lies before the sums.
/// Sums of 16 bits are below 2^15.
template <int channels, bool keepAlpha, class S, class T, class Rule>
void acrossRunning(const S* sums, ptrdiff_t columns, T* dst, ptrdiff_t elements, Rule rule) {
    const Vec<uint32_t> first = detail::firstSums<channels>(sums, columns - 1);
    runAlong<channels, keepAlpha, sizeof(S) == 2>(sums - channels, columns * channels, first, dst, elements, rule);
}

/// dst[i] = rule of the window of `columns` pixels that begins at row + i, an image's row.
template <int channels, class S, class T, class Rule>
void alongRow(const S* row, ptrdiff_t columns, T* dst, ptrdiff_t elements, Rule rule) {
    const Vec<uint32_t> first = detail::firstSums<channels>(row, columns);
    storeUpTo(dst, rule(&first, 0, channels), channels);
    runAlong<channels, false, false>(row, columns * channels, first, dst + channels, elements - channels, rule);
}

namespace detail {

/// `inUnits`: sums lie on top of the bits of 2^23 as a float, which saves their conversion.
template <bool inUnits>
QORI_NOINLINE void runPairs(const uint16_t* sums, ptrdiff_t columns, uint8_t* dst, ptrdiff_t elements, FloatMean rule) {
    const uint16_t* const before = sums - 1;
    __m256i carry = firstSums<1>(sums, columns - 1).v;
    if constexpr (inUnits) carry = _mm256_add_epi32(carry, _mm256_set1_epi32(kUnitsBits << 16));
    const __m256i both = _mm256_set1_epi32(0x00010001), second = _mm256_set1_epi32(0x00010000);
    forVectors<uint8_t>(
        elements, [&](ptrdiff_t i, auto count) __attribute__((always_inline)) {
            __m256i even[2], odd[2];
            for (int v = 0; v < 2; ++v) {
                const ptrdiff_t rest = count - v * 16;
                const uint16_t* const leaving = before + i + v * 16;
                const __m256i change = (loadUpTo(leaving + columns, rest) - loadUpTo(leaving, rest)).v;
                const Vec<uint32_t> inPairs{_mm256_madd_epi16(change, both)};
                odd[v] = _mm256_add_epi32(sumsUpTo<1>(inPairs).v, carry);
                even[v] = _mm256_sub_epi32(odd[v], _mm256_madd_epi16(change, second));
                carry = lastOfChannels<1>(Vec<uint32_t>{odd[v]}).v;
            }
            const auto mean = [&](__m256i s) __attribute__((always_inline)) {
                return inUnits ? rule.meanOfUnits(s) : rule.mean(Vec<uint32_t>{s});
            };
            storeUpTo(dst + i, packPairs(mean(even[0]), mean(odd[0]), mean(even[1]), mean(odd[1])), count);
        });
}

}  // namespace detail

/// As acrossRunning for bytes of one channel and columns below 2^15: two windows per lane.
inline void acrossPairs(const uint16_t* sums, ptrdiff_t columns, uint8_t* dst, ptrdiff_t elements, int64_t area) {
    if (area <= kMostInUnits)
        detail::runPairs<true>(sums, columns, dst, elements, FloatMean(area));
    else
        detail::runPairs<false>(sums, columns, dst, elements, FloatMean(area));
}

}  // namespace qori::kernels
