// SPDX-License-Identifier: Apache-2.0
// Histogram kernels: counts of every value of small types, sums of counters between levels, and searches of the bin of
// one element.
#pragma once
#include <algorithm>

#include "simd.h"

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
        for (int w = 0; w < words; ++w) word[w] = detail::loadWord<uint32_t>(src + 4 * w);
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

template <class L>
bool strictlyIncreasing(const L* levels, int32_t count) {
    for (int32_t k = 1; k < count; ++k)
        if (!(levels[k - 1] < levels[k])) return false;
    return true;
}

/// Counts an element in every bin that holds it: bins of disordered levels overlap.
template <class L>
void countInAllBins(L value, const L* levels, int32_t count, int32_t* bins) {
    for (int32_t k = 0; k < count - 1; ++k) bins[k] += levels[k] <= value && value < levels[k + 1];
}

/// How many of `count` increasing levels from `first` on are not above the value. The number of steps depends on the
/// count alone and no step branches on the data.
template <class L>
QORI_INLINE int32_t levelsUpTo(L value, const L* first, int32_t count) {
    const L* at = first;
    while (count > 0) {
        const int32_t half = (count + 1) >> 1;
        at += at[half - 1] <= value ? half : 0;
        count -= half;
    }
    return static_cast<int32_t>(at - first);
}

/// Counts 16-bit elements among increasing levels. Elements are counted by cells of 32 values, in two tables, so that
/// equal neighbours do not wait for each other's store. Where levels lie inside a cell, its elements are searched for
/// one by one.
class WordBins {
public:
    WordBins(const int32_t* levels, int32_t count, int32_t lowest, int32_t* bins)
        : levels_(levels), last_(count - 1), lowest_(lowest), bins_(bins) {
        int32_t k = 0, first = lowest;
        for (int cell = 0; cell < kCells; ++cell) {
            while (k < count && levels[k] <= first) ++k;
            below_[cell] = k;
            first += 1 << kCellBits;
            while (k < count && levels[k] < first) ++k;
            inside_[cell] = static_cast<uint8_t>(k - below_[cell]);
        }
    }
    template <class T>
    QORI_NOINLINE void countRow(const T* src, ptrdiff_t pixels, int step) {
        const auto countIn = [this](uint32_t* counts, int32_t value) {
            const int32_t cell = (value - lowest_) >> kCellBits;
            ++counts[cell];
            if (inside_[cell] != 0) [[unlikely]]
                addToBin(below_[cell] + levelsUpTo(value, levels_ + below_[cell], inside_[cell]) - 1, 1);
        };
        ptrdiff_t x = 0;
        for (; x <= pixels - 2; x += 2, src += 2 * step) {
            countIn(counts_[0], src[0]);
            countIn(counts_[1], src[step]);
        }
        if (x < pixels) countIn(counts_[0], *src);
    }
    /// Adds the counts of whole cells to their bins.
    void finish() {
        for (int cell = 0; cell < kCells; ++cell)
            if (inside_[cell] == 0) addToBin(below_[cell] - 1, counts_[0][cell] + counts_[1][cell]);
    }

private:
    static constexpr int kCellBits = 5;
    static constexpr int32_t kCells = 65'536 >> kCellBits;

    void addToBin(int32_t bin, uint32_t count) {
        if (static_cast<uint32_t>(bin) < static_cast<uint32_t>(last_)) bins_[bin] += static_cast<int32_t>(count);
    }

    const int32_t* levels_;
    int32_t last_;
    int32_t lowest_;  ///< Least value of the element type.
    int32_t* bins_;
    int32_t below_[kCells];   ///< Levels that are not above the cell's first value.
    uint8_t inside_[kCells];  ///< Levels among its other values.
    uint32_t counts_[2][kCells] = {};
};

/// Counts one channel of a row of floats among increasing levels; step is the distance of its elements.
QORI_NOINLINE inline void countFloatsRow(const float* src, ptrdiff_t pixels, int step, const float* levels,
                                         int32_t count, int32_t* bins) {
    // Outside 0 .. count - 2 where there is no bin. NaN is above no level.
    const auto binOf = [=](float value) { return levelsUpTo(value, levels, count) - 1; };
    const auto countIn = [=](int32_t bin) {
        if (static_cast<uint32_t>(bin) < static_cast<uint32_t>(count - 1)) ++bins[bin];
    };
    ptrdiff_t x = 0;
    for (; x <= pixels - 4; x += 4, src += 4 * step) {  // four searches at a time hide each other's latency
        const int32_t a = binOf(src[0]), b = binOf(src[step]), d = binOf(src[2 * step]), e = binOf(src[3 * step]);
        countIn(a);
        countIn(b);
        countIn(d);
        countIn(e);
    }
    for (; x < pixels; ++x, src += step) countIn(binOf(*src));
}

}  // namespace qori::kernels
