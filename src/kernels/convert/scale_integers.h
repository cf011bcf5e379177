// SPDX-License-Identifier: Apache-2.0
// Integers times a power of two, rounded on the magnitude and saturated, in 32-bit lanes. Magnitudes are unsigned and
// reach 2^32 - 1 (32u) or 2^31 (32s, its minimum).
#pragma once
#include "kernels/pack_convert.h"

namespace qori::kernels {

namespace detail {

QORI_INLINE __m256i notAbove(__m256i a, __m256i limit) { return _mm256_cmpeq_epi32(_mm256_min_epu32(a, limit), a); }

/// The largest magnitude that D holds for each sign; `negative` lanes are all ones.
template <class D>
QORI_INLINE __m256i limitOf(__m256i negative) {
    const __m256i most = _mm256_set1_epi32(static_cast<int>(std::numeric_limits<D>::max()));
    if constexpr (std::is_signed_v<D>)
        return _mm256_sub_epi32(most, negative);
    else
        return _mm256_andnot_si256(negative, most);
}

/// scale(magnitude, limit) between taking the sign off and putting it on.
template <class D, class S, int n, class Scale>
QORI_INLINE Pack<D, n> onMagnitudes(Pack<S, n> a, Scale scale) {
    Pack<int32_t, n> wide = extend<int32_t>(a);
    for (Vec<int32_t>& v : wide.v) {
        const __m256i negative = std::is_signed_v<S> ? _mm256_srai_epi32(v.v, 31) : _mm256_setzero_si256();
        const __m256i magnitude = _mm256_sub_epi32(_mm256_xor_si256(v.v, negative), negative);
        const __m256i scaled = scale(magnitude, limitOf<D>(negative));
        v.v = _mm256_sub_epi32(_mm256_xor_si256(scaled, negative), negative);
    }
    return fit<D>(wide);
}

}  // namespace detail

/// scaleFactor at or below 0: a left shift by up to 32 places; more saturates the same.
template <class S, class D>
struct ScaleUp {
    static constexpr bool mayStream = true;
    __m128i count;

    explicit ScaleUp(int32_t scaleFactor) : count(_mm_cvtsi32_si128(scaleFactor < -32 ? 32 : -scaleFactor)) {}

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        return detail::onMagnitudes<D>(a, [&](__m256i magnitude, __m256i limit) {
            const __m256i fits = detail::notAbove(magnitude, _mm256_srl_epi32(limit, count));
            return _mm256_blendv_epi8(limit, _mm256_sll_epi32(magnitude, count), fits);
        });
    }
};

/// scaleFactor of 1 to 32, more gives zeros: quotient and remainder apart, as their sum with a half would overflow.
template <class Mode, class S, class D>
struct ScaleDown {
    static constexpr bool mayStream = true;
    __m128i count;
    uint32_t remainderMask, half;

    explicit ScaleDown(int32_t scaleFactor)
        : count(_mm_cvtsi32_si128(scaleFactor > 33 ? 33 : scaleFactor)),
          remainderMask(scaleFactor > 32    ? 0u
                        : scaleFactor == 32 ? ~0u
                                            : (1u << scaleFactor) - 1u),
          half(scaleFactor > 32 ? ~0u : 1u << (scaleFactor - 1)) {}

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        return detail::onMagnitudes<D>(a, [&](__m256i magnitude, __m256i limit) {
            __m256i quotient = _mm256_srl_epi32(magnitude, count);
            if constexpr (!std::is_same_v<Mode, TowardZero>) {
                const __m256i rest = _mm256_and_si256(magnitude, _mm256_set1_epi32(static_cast<int>(remainderMask)));
                const __m256i odd = std::is_same_v<Mode, NearestEven> ? _mm256_and_si256(quotient, _mm256_set1_epi32(1))
                                                                      : _mm256_set1_epi32(1);
                // Up where rest > half, or rest = half and the quotient is odd: rest > half - odd.
                const __m256i down =
                    detail::notAbove(rest, _mm256_sub_epi32(_mm256_set1_epi32(static_cast<int>(half)), odd));
                quotient = _mm256_add_epi32(quotient, _mm256_andnot_si256(down, _mm256_set1_epi32(1)));
            }
            return _mm256_min_epu32(quotient, limit);
        });
    }
};

}  // namespace qori::kernels
