// SPDX-License-Identifier: Apache-2.0
// Places of elements among levels: place p of an element says that p levels are not above it. Elements come in blocks
// of one channel; what a block is padded with to whole vectors is read, but never counted.
#pragma once
#include <algorithm>
#include <utility>

#include "histogram.h"
#include "kernels/level_search.h"

namespace qori::kernels {

constexpr int kHistogramBlock = 1'024;  ///< Elements at most.
constexpr int kBlockPadding = 32;       ///< A block is readable up to the next multiple of this.

template <class T>
constexpr int32_t kWordLowest = std::is_signed_v<T> ? -32'768 : 0;

// --- elements above each of a few levels ----------------------------------------------------------------------------

namespace detail {

/// Levels compared at a time: their counters stay in registers.
#if defined(__x86_64__)
constexpr int kCompared = 8;
#else
constexpr int kCompared = 4;
#endif

inline int32_t sumLanes(__m256i v) {
    __m128i half = _mm_add_epi32(_mm256_castsi256_si128(v), _mm256_extracti128_si256(v, 1));
    half = _mm_add_epi32(half, _mm_srli_si128(half, 8));
    return _mm_cvtsi128_si32(_mm_add_epi32(half, _mm_srli_si128(half, 4)));
}

/// counts[i] = elements that are not below levels[i].
QORI_NOINLINE inline void countAtLeast(const float* block, int n, const float* levels, int32_t* counts) {
    __m256 limit[kCompared];
    __m256i sum[kCompared];
    for (int i = 0; i < kCompared; ++i) {
        limit[i] = _mm256_set1_ps(levels[i]);
        sum[i] = _mm256_setzero_si256();
    }
    for (int x = 0; x < n; x += 8) {
        const __m256 v = _mm256_loadu_ps(block + x);
        for (int i = 0; i < kCompared; ++i)
            sum[i] = _mm256_sub_epi32(sum[i], _mm256_castps_si256(_mm256_cmp_ps(v, limit[i], _CMP_GE_OQ)));
    }
    for (int i = 0; i < kCompared; ++i) counts[i] = sumLanes(sum[i]);
}

/// The same for 16-bit elements. A lane counts 64 elements of a block at most.
template <class T>
QORI_NOINLINE void countAtLeast(const T* block, int n, const int32_t* levels, int32_t* counts) {
    constexpr int32_t lowest = kWordLowest<T>, highest = lowest + 65'535;
    // Unsigned elements are compared with their top bit flipped.
    const __m256i flip = _mm256_set1_epi16(std::is_signed_v<T> ? 0 : -0x8000);
    __m256i limit[kCompared], sum[kCompared];
    for (int i = 0; i < kCompared; ++i) {
        const int32_t under = std::clamp(levels[i], lowest + 1, highest + 1) - 1;
        limit[i] = _mm256_xor_si256(_mm256_set1_epi16(static_cast<int16_t>(under)), flip);
        sum[i] = _mm256_setzero_si256();
    }
    for (int x = 0; x < n; x += 16) {
        const __m256i v = _mm256_xor_si256(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(block + x)), flip);
        for (int i = 0; i < kCompared; ++i) sum[i] = _mm256_sub_epi16(sum[i], _mm256_cmpgt_epi16(v, limit[i]));
    }
    for (int i = 0; i < kCompared; ++i)
        counts[i] = levels[i] <= lowest ? n : sumLanes(_mm256_madd_epi16(sum[i], _mm256_set1_epi16(1)));
}

}  // namespace detail

/// What pads a block for countByComparison: above no level that is compared.
template <class T>
constexpr T kPadding = std::is_signed_v<T> ? -32'768 : 0;
template <>
constexpr float kPadding<float> = __builtin_nanf("");

/// Adds a block's elements to every bin that holds them. The levels need no order: a bin holds what is not below its
/// lower level, less what is not below its upper one.
template <class T, class L>
void countByComparison(const T* block, int n, const L* levels, int32_t count, int32_t* bins) {
    constexpr int group = detail::kCompared;
    int32_t before = 0;
    for (int32_t k = 0; k < count; k += group) {
        const int32_t some = std::min(count - k, group);
        L level[group];
        int32_t atLeast[group];
        for (int i = 0; i < group; ++i) level[i] = levels[k + std::min(i, some - 1)];
        detail::countAtLeast(block, n, level, atLeast);
        for (int32_t i = 0; i < some; ++i) {
            const int32_t bin = k + i - 1;
            if (bin >= 0 && levels[bin] < levels[bin + 1]) bins[bin] += before - atLeast[i];
            before = atLeast[i];
        }
    }
}

// --- places ---------------------------------------------------------------------------------------------------------

/// Whether each level is the one before and 1.
inline bool increaseByOne(const int32_t* levels, int32_t count) {
    if (int64_t{levels[count - 1]} - levels[0] != count - 1) return false;
    int32_t k = 0;
    for (; k + 8 < count; k += 8)
        if (!detail::consecutive(levels + k)) return false;
    for (; k + 1 < count; ++k)
        if (levels[k + 1] - int64_t{levels[k]} != 1) return false;
    return true;
}

/// Places of 16-bit elements among levels in any order. Levels up to the lowest value or above the highest lie between
/// no two elements and do not count, and equal ones count once.
class WordPlaces {
public:
    explicit WordPlaces(int32_t lowest) : lowest_(static_cast<uint32_t>(lowest)) {}

protected:
    uint32_t offset(int32_t value) const { return static_cast<uint32_t>(value) - lowest_; }
    static bool parts(uint32_t offset) { return offset - 1 < 65'535; }

    /// Place of the first element that is not below the level, where there is one.
    template <class Place>
    uint32_t ofLevel(int32_t level, uint32_t last, Place place) const {
        const uint32_t value = offset(level);
        if (value < 65'536) return place(value);
        return level < static_cast<int32_t>(lowest_) ? 0 : last + 1;
    }

    uint32_t lowest_;
};

/// Where all levels are multiples of a power of two from the lowest value on, places are cells of that width: more than
/// there need be, but found by a shift.
class EvenWordPlaces : public WordPlaces {
public:
    EvenWordPlaces(const int32_t* levels, int32_t count, int32_t lowest) : WordPlaces(lowest) {
        uint32_t all = 65'536;
        for (int32_t k = 0; k < count; ++k) all |= parts(offset(levels[k])) ? offset(levels[k]) : 0;
        shift_ = __builtin_ctz(all);
    }
    uint32_t last() const { return (65'536u >> shift_) - 1; }
    uint32_t place(int32_t value) const { return offset(value) >> shift_; }
    uint32_t placeOfLevel(int32_t level) const {
        return ofLevel(level, last(), [this](uint32_t value) { return value >> shift_; });
    }

private:
    int shift_;
};

/// Any levels, as one bit per value: a place is the number of bits up to the element, looked up by cells of 32 values.
class AnyWordPlaces : public WordPlaces {
public:
    AnyWordPlaces(const int32_t* levels, int32_t count, int32_t lowest) : WordPlaces(lowest) {
        for (Cell& cell : cells_) cell.bits = 0;
        for (int32_t k = 0; k < count; ++k) {
            const uint32_t value = offset(levels[k]);
            if (parts(value)) cells_[value >> 5].bits |= 1u << (value & 31);
        }
        uint32_t below = 0;
        for (Cell& cell : cells_) {
            cell.below = below;
            below += static_cast<uint32_t>(__builtin_popcount(cell.bits));
        }
        last_ = below;
    }
    uint32_t last() const { return last_; }
    uint32_t place(int32_t value) const { return ofOffset(offset(value)); }
    uint32_t placeOfLevel(int32_t level) const {
        return ofLevel(level, last_, [this](uint32_t value) { return ofOffset(value); });
    }

private:
    struct Cell {
        uint32_t bits;
        uint32_t below;  ///< Bits of the cells before.
    };

    uint32_t ofOffset(uint32_t value) const {
        const Cell cell = cells_[value >> 5];
        return cell.below + static_cast<uint32_t>(__builtin_popcount(cell.bits << (~value & 31)));
    }

    uint32_t last_;
    Cell cells_[65'536 / 32];
};

// --- counting places ------------------------------------------------------------------------------------------------

/// Counters of the places from `first` on, as many as there is room for. Neighbours count in tables of their own, so
/// that equal ones do not wait for each other's store.
class PlaceCounters {
public:
    static constexpr uint32_t kPlaces = 2'048;

    PlaceCounters(uint32_t first, uint32_t places) : first_(first), counted_(std::min(places, kPlaces)) {
        tables_ = counted_ <= kPlaces / 2 ? 4 : 2;
        for (int t = 0; t < tables_; ++t)
            for (uint32_t p = 0; p <= counted_; ++p) table(t)[p] = 0;
    }
    /// Counts elements that are `step` apart. `all`: every element has one of the places. Else the others count in a
    /// counter that nobody reads.
    template <bool all, class T, class Place>
    QORI_INLINE void count(const T* src, ptrdiff_t n, int step, Place place) {
        if (tables_ == 4)
            countIn<4, all>(src, n, step, place);
        else
            countIn<2, all>(src, n, step, place);
    }
    /// Adds up the tables: then below(p) are the elements whose places lie in first .. p - 1.
    void finish() {
        for (int t = 1; t < tables_; ++t) {
            const uint32_t* const other = table(t);
            for (uint32_t p = 0; p < counted_; ++p) counters_[p] += other[p];
        }
        uint32_t total = 0;
        for (uint32_t p = 0; p <= counted_; ++p) total += std::exchange(counters_[p], total);
    }
    uint32_t below(uint32_t place) const { return place <= first_ ? 0 : counters_[std::min(place - first_, counted_)]; }

private:
    /// Tables lie 64 bytes off multiples of 4096: a store would hold up loads from the same place of another one.
    static constexpr uint32_t kApart = kPlaces / 2 + 16;

    template <int tables, bool all, class T, class Place>
    QORI_NOINLINE void countIn(const T* src, ptrdiff_t n, int step, Place place) {
        const auto countOne = [&](T value, int t) {
            const uint32_t p = place(value) - first_;
            ++table<tables>(t)[all ? p : std::min(p, counted_)];
        };
        ptrdiff_t x = 0;
        for (; x <= n - tables; x += tables, src += tables * step)
            for (int t = 0; t < tables; ++t) countOne(src[t * step], t);
        for (; x < n; ++x, src += step) countOne(*src, 0);
    }
    template <int tables>
    uint32_t* table(int t) {
        return counters_ + static_cast<uint32_t>(t) * (4 / tables) * kApart;
    }
    uint32_t* table(int t) { return tables_ == 4 ? table<4>(t) : table<2>(t); }

    uint32_t first_;
    uint32_t counted_;
    int tables_;
    uint32_t counters_[4 * kApart];
};

/// Counts a block's places in counters[place - first], as far as those are below `counted`; the block is overwritten.
/// Others count in counter 0 and are returned, to be taken off it: so no element branches. Four equal neighbours count
/// at once: they would wait for each other's store.
QORI_NOINLINE inline uint32_t countPlaces(uint32_t* places, int n, uint32_t first, uint32_t counted,
                                          int32_t* counters) {
    uint32_t others = 0;
    for (int x = 0; x < n; ++x) {
        const uint32_t place = places[x] - first;
        others += place < counted ? 0 : 1;
        places[x] = place < counted ? place : 0;
    }
    const int fours = n & ~3;
    for (int x = 0; x < fours; x += 4) {
        const uint32_t a = places[x], b = places[x + 1], c = places[x + 2], d = places[x + 3];
        if (((a ^ b) | (a ^ c) | (a ^ d)) == 0) {
            counters[a] += 4;
        } else {
            ++counters[a];
            ++counters[b];
            ++counters[c];
            ++counters[d];
        }
    }
    for (int i = 0; i < (n & 3); ++i) ++counters[places[fours + i]];
    return others;
}

}  // namespace qori::kernels
