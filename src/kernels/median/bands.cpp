// SPDX-License-Identifier: Apache-2.0
#include "bands.h"

#include <algorithm>

namespace qori::kernels {
namespace {

/// The counts of a column, and their sums over a window as words.
template <int lanes>
struct Band {
    static constexpr int n = lanes / 32;
    struct Column {
        __m256i v[n];
    };
    struct Sums {
        __m256i v[2 * n];
    };

    QORI_INLINE static Column column(const uint8_t* p) {
        Column c;
        for (int k = 0; k < n; ++k) c.v[k] = _mm256_load_si256(reinterpret_cast<const __m256i*>(p) + k);
        return c;
    }
    QORI_INLINE static void store(uint8_t* p, const Column& c) {
        for (int k = 0; k < n; ++k) _mm256_store_si256(reinterpret_cast<__m256i*>(p) + k, c.v[k]);
    }
    QORI_INLINE static Column less(Column a, const Column& b) {
        for (int k = 0; k < n; ++k) a.v[k] = _mm256_sub_epi8(a.v[k], b.v[k]);
        return a;
    }
    /// -1 in lanes of thresholds that the value is up to, of those that count at all.
    QORI_INLINE static Column counting(int value, Column thresholds, const Column& any) {
        const __m256i v = _mm256_set1_epi8(static_cast<char>(value));
        for (int k = 0; k < n; ++k) {
            const __m256i t = thresholds.v[k];
            thresholds.v[k] = _mm256_and_si256(_mm256_cmpeq_epi8(_mm256_max_epu8(t, v), t), any.v[k]);
        }
        return thresholds;
    }
    QORI_INLINE static void add(Sums& sums, const Column& signedCounts) {
        for (int k = 0; k < n; ++k) {
            const __m256i c = signedCounts.v[k], signs = _mm256_cmpgt_epi8(_mm256_setzero_si256(), c);
            sums.v[2 * k] = _mm256_add_epi16(sums.v[2 * k], _mm256_unpacklo_epi8(c, signs));
            sums.v[2 * k + 1] = _mm256_add_epi16(sums.v[2 * k + 1], _mm256_unpackhi_epi8(c, signs));
        }
    }
    QORI_INLINE static unsigned above(const Sums& sums, __m256i below) {
        unsigned count = 0;
        for (int k = 0; k < n; ++k) {
            const __m256i low = _mm256_cmpgt_epi16(sums.v[2 * k], below),
                          high = _mm256_cmpgt_epi16(sums.v[2 * k + 1], below);
            const int bits = _mm256_movemask_epi8(_mm256_packs_epi16(low, high));
            count += static_cast<unsigned>(__builtin_popcount(static_cast<unsigned>(bits)));
        }
        return count;
    }
    QORI_INLINE static void storeSums(uint16_t* p, const Sums& sums) {
        for (int k = 0; k < 2 * n; ++k) _mm256_store_si256(reinterpret_cast<__m256i*>(p) + k, sums.v[k]);
    }
    /// Where storeSums puts a lane.
    static constexpr int place(int lane) {
        const int within = lane % 32, half = within / 8 % 2;
        return lane / 32 * 32 + 16 * half + within / 16 * 8 + within % 8;
    }
};

template <>
struct Band<16> {
    using Column = __m128i;
    using Sums = __m256i;

    QORI_INLINE static Column column(const uint8_t* p) { return _mm_load_si128(reinterpret_cast<const __m128i*>(p)); }
    QORI_INLINE static void store(uint8_t* p, Column c) { _mm_store_si128(reinterpret_cast<__m128i*>(p), c); }
    QORI_INLINE static Column less(Column a, Column b) { return _mm_sub_epi8(a, b); }
    QORI_INLINE static Column counting(int value, Column thresholds, Column any) {
        const Column v = _mm_set1_epi8(static_cast<char>(value));
        return _mm_and_si128(_mm_cmpeq_epi8(_mm_max_epu8(thresholds, v), thresholds), any);
    }
    QORI_INLINE static void add(Sums& sums, Column signedCounts) {
        sums = _mm256_add_epi16(sums, _mm256_cvtepi8_epi16(signedCounts));
    }
    QORI_INLINE static unsigned above(Sums sums, __m256i below) {
        const int bits = _mm256_movemask_epi8(_mm256_cmpgt_epi16(sums, below));
        return static_cast<unsigned>(__builtin_popcount(static_cast<unsigned>(bits))) / 2;
    }
    QORI_INLINE static void storeSums(uint16_t* p, Sums sums) {
        _mm256_store_si256(reinterpret_cast<__m256i*>(p), sums);
    }
    static constexpr int place(int lane) { return lane; }
};

}  // namespace

template <int lanes>
void ColumnBands<lanes>::setTable(const Thresholds& thresholds) {
    // Behind the last one, all count everything.
    alignas(kVectorBytes) uint8_t at[lanes], counts[lanes];
    for (int i = 0; i < lanes; ++i) {
        const int threshold = i < thresholds.count ? thresholds.at[i] : 255;
        at[i] = static_cast<uint8_t>(threshold);
        counts[i] = threshold < 0 ? 0 : 255;
    }
    using B = Band<lanes>;
    const auto ends = B::column(at), any = B::column(counts);
    for (int value = 0; value < 256; ++value) B::store(table_ + value * lanes, B::counting(value, ends, any));
    for (int above = 0; above <= lanes; ++above)
        previous_[above] = static_cast<uint8_t>(Band<lanes>::place(std::max(lanes - above - 1, 0)));
}

template <int lanes>
void ColumnBands<lanes>::setValues(const Thresholds& thresholds) {
    setTable(thresholds);
    for (int above = 0; above <= lanes; ++above) {
        const int first = lanes - above;
        const bool isNamed =
            0 < first && first < thresholds.count && thresholds.at[first] == thresholds.at[first - 1] + 1;
        name_[above] = isNamed ? static_cast<uint16_t>(thresholds.at[first]) : kMissed;
    }
}

template <int lanes>
void ColumnBands<lanes>::setNumbers(const Thresholds& thresholds) {
    setTable(thresholds);
    for (int above = 0; above <= lanes; ++above) name_[above] = static_cast<uint16_t>(lanes - above);
}

template <int lanes>
void ColumnBands<lanes>::build(const ByteRows& rows, int32_t y, int32_t columns, int32_t height) {
    using B = Band<lanes>;
    for (int32_t x = 0; x < columns; ++x) {
        typename B::Column counts{};
        const uint8_t* p = rows.row(y) + x * rows.apart;
        for (int32_t k = 0; k < height; ++k, p += rows.step)
            counts = B::less(counts, B::column(table_ + ptrdiff_t{*p} * lanes));
        B::store(counts_ + ptrdiff_t{x} * lanes, counts);
    }
}

template <int lanes>
void ColumnBands<lanes>::advance(const uint8_t* entering, const uint8_t* leaving, ptrdiff_t apart, int32_t columns) {
    using B = Band<lanes>;
    uint8_t *const counts = counts_, *const table = table_;  // what is stored are bytes, which may be anything
    const auto forColumns = [=](ptrdiff_t distance) __attribute__((always_inline)) {
#pragma GCC unroll 4
        for (ptrdiff_t x = 0; x < columns; ++x) {
            const auto in = B::column(table + ptrdiff_t{entering[x * distance]} * lanes);
            const auto out = B::column(table + ptrdiff_t{leaving[x * distance]} * lanes);
            uint8_t* const p = counts + x * lanes;
            B::store(p, B::less(B::column(p), B::less(in, out)));
        }
    };
    apart == 1 ? forColumns(1) : forColumns(apart);
}

template <int lanes>
template <bool wantsRests>
bool ColumnBands<lanes>::find(int32_t columns, int32_t width, int32_t below, uint8_t* to, uint16_t* rests) const {
    using B = Band<lanes>;
    alignas(kVectorBytes) uint16_t stored[lanes];
    typename B::Sums sums{};
    const __m256i most = _mm256_set1_epi16(static_cast<int16_t>(below));
    const uint8_t *leaving = counts_, *entering = counts_ + ptrdiff_t{width} * lanes;
    for (const uint8_t* p = leaving; p != entering; p += lanes) B::add(sums, B::column(p));
    unsigned names = 0;
    const auto findOne = [&](ptrdiff_t x) __attribute__((always_inline)) {
        const unsigned above = B::above(sums, most), name = name_[above];
        names |= name;
        to[x] = static_cast<uint8_t>(name);
        if constexpr (wantsRests) {
            B::storeSums(stored, sums);
            rests[x] = static_cast<uint16_t>(below - stored[previous_[above]]);
        }
    };
    const ptrdiff_t last = columns - width;
#pragma GCC unroll 4
    for (ptrdiff_t x = 0; x < last; ++x) {
        findOne(x);
        B::add(sums, B::less(B::column(entering + x * lanes), B::column(leaving + x * lanes)));
    }
    findOne(last);
    return names < kMissed;
}

template <int lanes>
bool ColumnBands<lanes>::medians(int32_t columns, int32_t width, int32_t below, uint8_t* to, uint16_t* rests) const {
    return rests == nullptr ? find<false>(columns, width, below, to, rests)
                            : find<true>(columns, width, below, to, rests);
}

template class ColumnBands<16>;
template class ColumnBands<32>;

}  // namespace qori::kernels
