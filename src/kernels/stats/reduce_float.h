// SPDX-License-Identifier: Apache-2.0
// Accumulators of float reductions: 48 lanes of single precision, or 24 of double precision. A lane of N elements adds
// N/48 (N/24) of them one after another, then the lanes are added pairwise.
#pragma once
#include "reduce_lanes.h"

namespace qori::kernels {

/// The elements of a float vector in double precision.
struct Doubles {
    __m256d low, high;
};

QORI_INLINE Doubles toDoubles(Vec<float> a) {
    return {_mm256_cvtps_pd(_mm256_castps256_ps128(a.v)), _mm256_cvtps_pd(_mm256_extractf128_ps(a.v, 1))};
}

/// Converts from memory, half by half.
QORI_INLINE Doubles loadDoubles(const float* p) {
    return {_mm256_cvtps_pd(_mm_loadu_ps(p)), _mm256_cvtps_pd(_mm_loadu_ps(p + 4))};
}

QORI_INLINE Doubles operator-(Doubles a, Doubles b) {
    return {_mm256_sub_pd(a.low, b.low), _mm256_sub_pd(a.high, b.high)};
}

QORI_INLINE Doubles magnitude(Doubles a) {
    const __m256d sign = _mm256_set1_pd(-0.0);
    return {_mm256_andnot_pd(sign, a.low), _mm256_andnot_pd(sign, a.high)};
}

/// In single precision: sums of values and of products alike.
struct FloatLanes {
    using Total = float;
    static constexpr int banks = 2, count = 8;
    static constexpr ptrdiff_t limit = detail::kNoLimit;

    __m256 sum;

    QORI_INLINE void add(Vec<float> a) { sum = _mm256_add_ps(sum, a.v); }
    QORI_INLINE void add(Vec<float> a, Vec<float> b) { sum = _mm256_fmadd_ps(a.v, b.v, sum); }
    void values(Total* out) const { _mm256_storeu_ps(out, sum); }
};

template <>
struct SumLanes<float> : FloatLanes {};
template <>
struct ProductLanes<float> : FloatLanes {};

/// In double precision from the element on: the difference of two sources too is taken there.
struct DoubleLanes {
    using Total = double;
    static constexpr int banks = 1, count = 8;
    static constexpr ptrdiff_t limit = detail::kNoLimit;

    __m256d low, high;

    QORI_INLINE static Doubles loadVector(const float* p) { return loadDoubles(p); }
    QORI_INLINE static Doubles loadRest(const float* p, ptrdiff_t n) { return toDoubles(loadUpTo(p, n)); }
    QORI_INLINE void add(Doubles a) {
        low = _mm256_add_pd(low, a.low);
        high = _mm256_add_pd(high, a.high);
    }
    /// Products of two floats are exact in double precision.
    QORI_INLINE void add(Doubles a, Doubles b) {
        low = _mm256_fmadd_pd(a.low, b.low, low);
        high = _mm256_fmadd_pd(a.high, b.high, high);
    }
    void values(Total* out) const {
        _mm256_storeu_pd(out, low);
        _mm256_storeu_pd(out + 4, high);
    }
};

}  // namespace qori::kernels
