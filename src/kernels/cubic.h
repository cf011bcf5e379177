// SPDX-License-Identifier: Apache-2.0
// The two-parameter family of cubic filters: Mitchell and Netravali, Reconstruction filters in computer graphics, 1988.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

struct Cubic {
    static constexpr int kSupport = 2;  ///< Pixels that it reaches to either side.

    double b, c;

    /// The weights at distances t >= 0.
    QORI_INLINE __m256d operator()(__m256d t) const {
        const auto all = [](double value) { return _mm256_set1_pd(value); };
        const auto times = [](__m256d x, __m256d y) { return _mm256_mul_pd(x, y); };
        const auto plus = [](__m256d x, __m256d y) { return _mm256_add_pd(x, y); };
        const __m256d low = plus(times(all(12 - 9 * b - 6 * c), t), all(-18 + 12 * b + 6 * c));
        const __m256d inner = plus(times(times(low, t), t), all(6 - 2 * b));
        const __m256d high = plus(times(all(-b - 6 * c), t), all(6 * b + 30 * c));
        const __m256d outer =
            plus(plus(times(times(high, t), t), times(all(-12 * b - 48 * c), t)), all(8 * b + 24 * c));
        const __m256d isInner = _mm256_cmp_pd(t, all(1), _CMP_LT_OQ), isInside = _mm256_cmp_pd(t, all(2), _CMP_LT_OQ);
        return _mm256_and_pd(_mm256_div_pd(_mm256_blendv_pd(outer, inner, isInner), all(6)), isInside);
    }
};

}  // namespace qori::kernels
