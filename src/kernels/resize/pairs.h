// SPDX-License-Identifier: Apache-2.0
// Sums of taps, in one order everywhere. Up to eight taps: w[0] * p[0], then one fused multiply-add per tap in
// ascending order. Up to twelve: the lower half like that, then the upper half from its far end on, so that the tap of
// the greatest weight, at the centre, comes last and what is rounded before is small. Up to 24, and from nine on where
// super-sampling weighs all taps alike: fours from both ends towards the centre, added up in turn. More: blocks of
// eight taps, each the sum of two ascending fours, are added up in double precision. Constants come out within 4 units
// in the last place then, both directions taken together, however many taps there are.
#pragma once
#include <algorithm>

#include "kernels/simd.h"

namespace qori::kernels {

/// So many vectors of two results at a time, as the registers allow.
inline constexpr int kPairVectors = sizeof(void*) == 4 ? 2 : 4;

inline constexpr int32_t kAscendingTaps = 8, kPairedTaps = 12, kChainTaps = 24, kTapsPerBlock = 8;

/// So many taps of a chain are summed in ascending order, the others in descending order behind them.
constexpr int32_t ascending(int32_t count) { return count > kAscendingTaps ? count / 2 : count; }

/// A weight in every lane, from memory or from a register.
QORI_INLINE __m256 weightOf(const float* w) { return _mm256_broadcast_ss(w); }
QORI_INLINE __m256 weightOf(const Vec<float>* w) { return w->v; }

/// Taps of two results, the second's `shift` (0 to count) behind the first's.
template <class Weight>
struct PairedTapsOf {
    const Weight *first, *second;  ///< Their weights.
    int32_t count, shift;
    int32_t more = 0;  ///< The second's taps beyond count, -1 to 1; others than 0 only with up to kAscendingTaps.

    /// Taps of either.
    int32_t all() const { return count + shift + more; }
};

using PairedTaps = PairedTapsOf<float>;

template <int vectors, class Weight>
QORI_INLINE void beginSum(const float* p, const Weight* w, __m256* sum) {
    const __m256 weight = weightOf(w);
    for (int v = 0; v < vectors; ++v) sum[v] = _mm256_mul_ps(weight, _mm256_loadu_ps(p + 8 * v));
}

template <int vectors, class Weight>
QORI_INLINE void addTap(const float* p, const Weight* w, __m256* sum) {
    const __m256 weight = weightOf(w);
    for (int v = 0; v < vectors; ++v) sum[v] = _mm256_fmadd_ps(weight, _mm256_loadu_ps(p + 8 * v), sum[v]);
}

template <int vectors, class Weight, class At>
QORI_INLINE void sumAscending(const Weight* w, int32_t count, At at, __m256* sum) {
    beginSum<vectors>(at(0), w, sum);
#pragma GCC unroll 12
    for (int32_t k = 1; k < count; ++k) addTap<vectors>(at(k), w + k, sum);
}

/// More than kAscendingTaps.
template <int vectors, class Weight, class At>
QORI_INLINE void sumFours(const Weight* w, int32_t count, At at, __m256* sum) {
    constexpr int32_t kFour = 4;
    const int32_t lower = count / 2, upper = count - lower;
    sumAscending<vectors>(w, kFour, at, sum);
    const auto add = [&](int32_t begin, int32_t taps, int32_t step) {
        __m256 four[vectors];
        beginSum<vectors>(at(begin), w + begin, four);
        const auto addNext = [&](int32_t k) { addTap<vectors>(at(begin + k * step), w + begin + k * step, four); };
        if (taps == kFour) {
            for (int32_t k = 1; k < kFour; ++k) addNext(k);
        } else {
            for (int32_t k = 1; k < taps; ++k) addNext(k);
        }
        for (int v = 0; v < vectors; ++v) sum[v] = _mm256_add_ps(sum[v], four[v]);
    };
    for (int32_t from = 0; from < upper; from += kFour) {
        if (0 < from && from < lower) add(from, std::min(lower - from, kFour), 1);
        add(count - 1 - from, std::min(upper - from, kFour), -1);
    }
}

/// Sums up a chain of `count` taps, of which `oneByOne` at most are not summed by fours. at(k) tells where the vectors
/// of tap k lie.
template <int vectors, class Weight, class At>
QORI_INLINE void sumChain(const Weight* w, int32_t count, At at, __m256* sum, int32_t oneByOne = kPairedTaps) {
    if (count > oneByOne) return sumFours<vectors>(w, count, at, sum);
    const int32_t upTo = ascending(count);
    sumAscending<vectors>(w, upTo, at, sum);
#pragma GCC unroll 12
    for (int32_t k = count - 1; k >= upTo; --k) addTap<vectors>(at(k), w + k, sum);
}

/// Totals of more taps than a chain has, in double precision.
template <int vectors>
struct Totals {
    __m256d low[vectors], high[vectors];

    QORI_INLINE void clear() {
        for (int v = 0; v < vectors; ++v) low[v] = high[v] = _mm256_setzero_pd();
    }
    /// Adds a block of 1 to kTapsPerBlock taps.
    template <class At>
    QORI_INLINE void addBlock(const float* w, int32_t count, At at) {
        constexpr int32_t half = kTapsPerBlock / 2;
        __m256 sum[vectors];
        sumAscending<vectors>(w, std::min(count, half), at, sum);
        if (count > half) {
            __m256 second[vectors];
            sumAscending<vectors>(
                w + half, count - half, [&](int32_t k) { return at(half + k); }, second);
            for (int v = 0; v < vectors; ++v) sum[v] = _mm256_add_ps(sum[v], second[v]);
        }
        for (int v = 0; v < vectors; ++v) {
            low[v] = _mm256_add_pd(low[v], _mm256_cvtps_pd(_mm256_castps256_ps128(sum[v])));
            high[v] = _mm256_add_pd(high[v], _mm256_cvtps_pd(_mm256_extractf128_ps(sum[v], 1)));
        }
    }
    /// Adds any number of taps that begin with a block.
    template <class At>
    QORI_INLINE void addBlocks(const float* w, int32_t count, At at) {
        int32_t k = 0;
        for (; k + kTapsPerBlock <= count; k += kTapsPerBlock)
            addBlock(w + k, kTapsPerBlock, [&](int32_t i) { return at(k + i); });
        if (k < count) addBlock(w + k, count - k, [&](int32_t i) { return at(k + i); });
    }
    QORI_INLINE __m256 times(double scale, int v) const {
        const __m256d factor = _mm256_set1_pd(scale);
        return _mm256_set_m128(_mm256_cvtpd_ps(_mm256_mul_pd(high[v], factor)),
                               _mm256_cvtpd_ps(_mm256_mul_pd(low[v], factor)));
    }
};

/// Sums up any number of taps.
template <int vectors, class At>
QORI_INLINE void sumOne(const float* w, int32_t count, At at, __m256* sum) {
    if (count <= kChainTaps) return sumChain<vectors>(w, count, at, sum);
    constexpr int kAtOnce = vectors % 2 == 0 ? 2 : 1;
    for (int v = 0; v < vectors; v += kAtOnce) {
        Totals<kAtOnce> totals;
        totals.clear();
        totals.addBlocks(w, count, [&](int32_t k) { return at(k) + 8 * v; });
        for (int i = 0; i < kAtOnce; ++i) sum[v + i] = totals.times(1, i);
    }
}

/// Sums up the chains of both results at once, so that a tap of both is loaded once; taps are counted from the first
/// result's. Where Fixed tells their numbers, the compiler knows them.
template <int vectors, class Fixed, class Weight, class At>
QORI_INLINE void sumPair(const PairedTapsOf<Weight>& taps, Fixed, At at, __m256* first, __m256* second) {
    const int32_t count = Fixed::count > 0 ? Fixed::count : taps.count;
    const int32_t shift = Fixed::count > 0 ? Fixed::shift : taps.shift;
    const int32_t upTo = Fixed::endsAtCentre ? ascending(count) : count, alone = std::min(shift + 1, upTo);
    const auto addToBoth = [&](int32_t k) {
        const float* const p = at(k);
        const __m256 a = weightOf(taps.first + k), b = weightOf(taps.second + k - shift);
        for (int v = 0; v < vectors; ++v) {
            __m256 both = _mm256_loadu_ps(p + 8 * v);
            loadOnce(both);
            first[v] = _mm256_fmadd_ps(a, both, first[v]);
            second[v] = _mm256_fmadd_ps(b, both, second[v]);
        }
    };
    beginSum<vectors>(at(0), taps.first, first);
#pragma GCC unroll 16
    for (int32_t k = 1; k < alone; ++k) addTap<vectors>(at(k), taps.first + k, first);
    beginSum<vectors>(at(shift), taps.second, second);
#pragma GCC unroll 16
    for (int32_t k = alone; k < upTo; ++k) addToBoth(k);
#pragma GCC unroll 16
    for (int32_t k = std::max(upTo, shift + 1); k < upTo + shift + (Fixed::count > 0 ? 0 : taps.more); ++k)
        addTap<vectors>(at(k), taps.second + k - shift, second);
    if constexpr (!Fixed::endsAtCentre) return;
    for (int32_t k = count + shift - 1; k >= std::max(count, upTo + shift); --k)
        addTap<vectors>(at(k), taps.second + k - shift, second);
    for (int32_t k = count - 1; k >= upTo + shift; --k) addToBoth(k);
    for (int32_t k = std::min(count, upTo + shift) - 1; k >= upTo; --k) addTap<vectors>(at(k), taps.first + k, first);
}

/// Numbers of taps and shifts that are so small that loops over them would cost as much as their sums.
template <int taps, int by>
struct FixedTaps {
    static constexpr int count = taps, shift = by;
    static constexpr bool endsAtCentre = taps > kAscendingTaps;
};
/// Any number of taps that are summed in ascending order, or of more.
template <bool isCentred>
struct AnyTaps {
    static constexpr int count = 0, shift = 0;
    static constexpr bool endsAtCentre = isCentred;
};

template <class Use>
QORI_INLINE void withAnyTaps(const PairedTaps& taps, Use use) {
    if (taps.count > kAscendingTaps) return use(AnyTaps<true>{});
    use(AnyTaps<false>{});
}

/// Calls use(choice) with the one that fits.
template <class Use>
QORI_INLINE void withFixedTaps(const PairedTaps& taps, Use use) {
    const auto shifted = [&]<int count>() {
        switch (taps.shift) {
            case 0: return use(FixedTaps<count, 0>{});
            case 1: return use(FixedTaps<count, 1>{});
            case 2: return use(FixedTaps<count, 2>{});
            default: return withAnyTaps(taps, use);
        }
    };
    switch (taps.count) {
        case 2: return shifted.template operator()<2>();
        case 4: return shifted.template operator()<4>();
        case 6: return shifted.template operator()<6>();
        case 10: return shifted.template operator()<10>();
        default: return withAnyTaps(taps, use);
    }
}

}  // namespace qori::kernels
