// SPDX-License-Identifier: Apache-2.0
// Sums of taps, in one order everywhere: w[0] * p[0], then one fused multiply-add per tap in ascending order.
#pragma once
#include <algorithm>

#include "simd.h"

namespace qori::kernels {

/// So many vectors of two results at a time, as the registers allow.
inline constexpr int kPairVectors = sizeof(void*) == 4 ? 2 : 4;

/// A weight in every lane, from memory or from a register.
QORI_INLINE __m256 weightOf(const float* w) { return _mm256_broadcast_ss(w); }
QORI_INLINE __m256 weightOf(const Vec<float>* w) { return w->v; }

/// Taps of two results, the second's `shift` (0 to count) behind the first's.
template <class Weight>
struct PairedTapsOf {
    const Weight *first, *second;  ///< Their weights.
    int32_t count, shift;

    /// Taps of either.
    int32_t all() const { return count + shift; }
};

using PairedTaps = PairedTapsOf<float>;

namespace detail {

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

}  // namespace detail

/// Sums up the first result. at(k) tells where the vectors of tap k lie.
template <int vectors, class At>
QORI_INLINE void sumOne(const PairedTaps& taps, At at, __m256* sum) {
    detail::beginSum<vectors>(at(0), taps.first, sum);
    for (int32_t k = 1; k < taps.count; ++k) detail::addTap<vectors>(at(k), taps.first + k, sum);
}

/// Sums up both at once, so that a tap of both is loaded once; taps are counted from the first result's. Where Fixed
/// tells their numbers, the compiler knows them.
template <int vectors, class Fixed, class Weight, class At>
QORI_INLINE void sumPair(const PairedTapsOf<Weight>& taps, Fixed, At at, __m256* first, __m256* second) {
    const int32_t count = Fixed::count > 0 ? Fixed::count : taps.count;
    const int32_t shift = Fixed::count > 0 ? Fixed::shift : taps.shift;
    const int32_t alone = std::min(shift + 1, count);
    detail::beginSum<vectors>(at(0), taps.first, first);
#pragma GCC unroll 16
    for (int32_t k = 1; k < alone; ++k) detail::addTap<vectors>(at(k), taps.first + k, first);
    detail::beginSum<vectors>(at(shift), taps.second, second);
#pragma GCC unroll 16
    for (int32_t k = alone; k < count; ++k) {
        const float* const p = at(k);
        const __m256 a = weightOf(taps.first + k), b = weightOf(taps.second + k - shift);
        for (int v = 0; v < vectors; ++v) {
            __m256 both = _mm256_loadu_ps(p + 8 * v);
            loadOnce(both);
            first[v] = _mm256_fmadd_ps(a, both, first[v]);
            second[v] = _mm256_fmadd_ps(b, both, second[v]);
        }
    }
#pragma GCC unroll 16
    for (int32_t k = std::max(count, shift + 1); k < count + shift; ++k)
        detail::addTap<vectors>(at(k), taps.second + k - shift, second);
}

/// Numbers of taps and shifts that are so small that loops over them would cost as much as their sums.
template <int taps, int by>
struct FixedTaps {
    static constexpr int count = taps, shift = by;
};
using AnyTaps = FixedTaps<0, 0>;

/// Calls use(choice) with the one that fits.
template <class Use>
QORI_INLINE void withFixedTaps(const PairedTaps& taps, Use use) {
    const auto shifted = [&]<int count>() {
        switch (taps.shift) {
            case 0: return use(FixedTaps<count, 0>{});
            case 1: return use(FixedTaps<count, 1>{});
            case 2: return use(FixedTaps<count, 2>{});
            default: return use(AnyTaps{});
        }
    };
    switch (taps.count) {
        case 2: return shifted.template operator()<2>();
        case 4: return shifted.template operator()<4>();
        case 6: return shifted.template operator()<6>();
        case 10: return shifted.template operator()<10>();
        default: return use(AnyTaps{});
    }
}

}  // namespace qori::kernels
