// SPDX-License-Identifier: Apache-2.0
// Histogram kernels for types of few values: counts of every value, and sums of counters between levels.
#pragma once
#include <algorithm>

#include "kernels/simd.h"

namespace qori::kernels {

/// Counters of bytes. Neighbours count in tables of their own, so that equal ones do not wait for each other's store:
/// the distance between two increments of one counter is 6 elements or more.
template <int channels>
struct ByteCounters {
    static constexpr int tables = channels == 3 ? 6 : 8;
    static constexpr int group = channels == 3 ? 12 : 8;  ///< Elements read at a time, whole pixels.

    uint32_t table[tables][256] = {};

    /// Adds up the tables of one channel.
    void ofChannel(int channel, uint32_t* out) const {
        for (int value = 0; value < 256; value += 8) {
            __m256i sum = _mm256_setzero_si256();
            for (int t = channel; t < tables; t += channels)
                sum = _mm256_add_epi32(sum, _mm256_loadu_si256(reinterpret_cast<const __m256i*>(table[t] + value)));
            _mm256_storeu_si256(reinterpret_cast<__m256i*>(out + value), sum);
        }
    }
};

/// Counts one row; channels from `counted` on are passed over.
template <int channels, int counted>
QORI_NOINLINE void countBytesRow(ByteCounters<channels>& counters, const uint8_t* src, ptrdiff_t pixels) {
    using Counters = ByteCounters<channels>;
    constexpr int words = Counters::group / 4;
    const auto count = [&](uint32_t value, int element) {
        if (element % channels < counted) ++counters.table[element % Counters::tables][value];
    };
    ptrdiff_t elements = pixels * channels;
    for (; elements >= Counters::group; elements -= Counters::group, src += Counters::group) {
        uint32_t word[words];
        for (int w = 0; w < words; ++w) word[w] = qori::detail::loadWord<uint32_t>(src + 4 * w);
        for (int w = 0; w < words; ++w)
            for (int i = 0; i < 4; ++i) count(word[w] >> (8 * i) & 255u, 4 * w + i);
    }
    for (int i = 0; i < elements; ++i) count(src[i], i);
}

/// Counts one row of 16-bit elements, all values, into one table per channel. `flip` is 0x8000 for signed elements, so
/// that tables ascend. Four equal neighbours count at once: they would wait for each other's store.
template <int channels>
QORI_NOINLINE void countWordsRow(uint32_t* table, const uint16_t* src, ptrdiff_t pixels, uint32_t flip) {
    constexpr int kValues = 65'536;
    ptrdiff_t x = 0;
    for (; x <= pixels - 4; x += 4, src += 4 * channels)
        for (int c = 0; c < channels; ++c) {
            uint32_t* const own = table + c * kValues;
            const uint32_t a = src[c], b = src[channels + c], d = src[2 * channels + c], e = src[3 * channels + c];
            if (((a ^ b) | (a ^ d) | (a ^ e)) == 0) {
                own[a ^ flip] += 4;
            } else {
                ++own[a ^ flip];
                ++own[b ^ flip];
                ++own[d ^ flip];
                ++own[e ^ flip];
            }
        }
    for (; x < pixels; ++x, src += channels)
        for (int c = 0; c < channels; ++c) ++table[c * kValues + static_cast<int>(src[c] ^ flip)];
}

namespace detail {

inline uint32_t sumCounters(const uint32_t* first, const uint32_t* last) {
    __m256i sums = _mm256_setzero_si256();
    for (; last - first >= 8; first += 8)
        sums = _mm256_add_epi32(sums, _mm256_loadu_si256(reinterpret_cast<const __m256i*>(first)));
    __m128i half = _mm_add_epi32(_mm256_castsi256_si128(sums), _mm256_extracti128_si256(sums, 1));
    half = _mm_add_epi32(half, _mm_srli_si128(half, 8));
    half = _mm_add_epi32(half, _mm_srli_si128(half, 4));
    auto sum = static_cast<uint32_t>(_mm_cvtsi128_si32(half));
    for (; first < last; ++first) sum += *first;
    return sum;
}

/// Whether nine levels follow each other by one, so that eight bins are eight counters.
inline bool consecutive(const int32_t* levels) {
    const __m256i low = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(levels));
    const __m256i high = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(levels + 1));
    return _mm256_movemask_epi8(_mm256_cmpeq_epi32(_mm256_sub_epi32(high, low), _mm256_set1_epi32(1))) == -1;
}

}  // namespace detail

/// bins[k] = sum of the counters of the values from levels[k] up to levels[k + 1]. Counter 0 is that of `lowest`, and
/// levels beyond the counters are clamped. Levels need no order.
inline void sumBins(const uint32_t* counters, int32_t values, int32_t lowest, const int32_t* levels, int32_t count,
                    int32_t* bins) {
    const auto clamped = [=](int32_t level) {
        return static_cast<int32_t>(std::clamp<int64_t>(int64_t{level} - lowest, 0, values));
    };
    int32_t k = 0;
    while (k < count - 1) {
        const int32_t from = clamped(levels[k]);
        if (k + 8 < count && levels[k] >= lowest && from <= values - 8 && detail::consecutive(levels + k)) {
            _mm256_storeu_si256(reinterpret_cast<__m256i*>(bins + k),
                                _mm256_loadu_si256(reinterpret_cast<const __m256i*>(counters + from)));
            k += 8;
            continue;
        }
        const int32_t to = clamped(levels[k + 1]);
        bins[k++] = from < to ? static_cast<int32_t>(detail::sumCounters(counters + from, counters + to)) : 0;
    }
}

}  // namespace qori::kernels
