// SPDX-License-Identifier: Apache-2.0
// Packs from one element type to another: exact extension, saturating narrowing, integers to and from float.
#pragma once
#include <limits>

#include "map.h"

namespace qori::kernels {

/// Bytes [index * 32 / ratio, ...) of a, extended to one vector of D; ratio = sizeof(D) / sizeof(S).
template <class D, class S>
QORI_INLINE Vec<D> extendPart(Vec<S> a, int index) {
    constexpr int ratio = static_cast<int>(sizeof(D) / sizeof(S));
    const __m128i half = index * 2 < ratio ? _mm256_castsi256_si128(a.v) : _mm256_extracti128_si256(a.v, 1);
    const __m128i part = ratio == 4 && index % 2 == 1 ? _mm_srli_si128(half, 8) : half;
    if constexpr (sizeof(S) == 1 && ratio == 2) {
        return {std::is_signed_v<S> ? _mm256_cvtepi8_epi16(part) : _mm256_cvtepu8_epi16(part)};
    } else if constexpr (sizeof(S) == 1) {
        return {std::is_signed_v<S> ? _mm256_cvtepi8_epi32(part) : _mm256_cvtepu8_epi32(part)};
    } else {
        static_assert(sizeof(S) == 2 && ratio == 2);
        return {std::is_signed_v<S> ? _mm256_cvtepi16_epi32(part) : _mm256_cvtepu16_epi32(part)};
    }
}

/// Zero or sign extension by the source's signedness; integers of one size keep their bits.
template <class D, class S, int n>
QORI_INLINE Pack<D, n> extend(Pack<S, n> a) {
    Pack<D, n> out;
    constexpr int ratio = static_cast<int>(sizeof(D) / sizeof(S));
    for (int i = 0; i < Pack<D, n>::vectors; ++i) {
        if constexpr (ratio == 1)
            out.v[i] = {a.v[i].v};
        else
            out.v[i] = extendPart<D>(a.v[i / ratio], i % ratio);
    }
    return out;
}

/// 32-bit to 16-bit lanes, saturating; in the order of the elements.
template <class D>
QORI_INLINE Vec<D> narrowPair(Vec<int32_t> low, Vec<int32_t> high) {
    const __m256i mixed = std::is_signed_v<D> ? _mm256_packs_epi32(low.v, high.v) : _mm256_packus_epi32(low.v, high.v);
    return {_mm256_permute4x64_epi64(mixed, 0xD8)};
}

/// 16-bit to 8-bit lanes, saturating.
template <class D>
QORI_INLINE Vec<D> narrowPair(Vec<int16_t> low, Vec<int16_t> high) {
    const __m256i mixed = std::is_signed_v<D> ? _mm256_packs_epi16(low.v, high.v) : _mm256_packus_epi16(low.v, high.v);
    return {_mm256_permute4x64_epi64(mixed, 0xD8)};
}

/// Signed integers to a narrower type, saturating.
template <class D, class S, int n>
QORI_INLINE Pack<D, n> narrow(Pack<S, n> a) {
    static_assert(std::is_signed_v<S> && sizeof(S) > sizeof(D));
    if constexpr (sizeof(S) == 2 * sizeof(D)) {
        Pack<D, n> out;
        for (int i = 0; i < Pack<D, n>::vectors; ++i) out.v[i] = narrowPair<D>(a.v[2 * i], a.v[2 * i + 1]);
        return out;
    } else {
        // 32 to 8 bits: by way of signed 16 bits, which hold the range of either 8-bit type.
        Pack<D, n> out;
        for (int i = 0; i < Pack<D, n>::vectors; ++i) {
            const __m256i low = _mm256_packs_epi32(a.v[4 * i].v, a.v[4 * i + 1].v);
            const __m256i high = _mm256_packs_epi32(a.v[4 * i + 2].v, a.v[4 * i + 3].v);
            const __m256i mixed = std::is_signed_v<D> ? _mm256_packs_epi16(low, high) : _mm256_packus_epi16(low, high);
            out.v[i] = {_mm256_permutevar8x32_epi32(mixed, _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7))};
        }
        return out;
    }
}

/// 32-bit lanes that are already within the destination's range to that type, any signedness.
template <class D, int n>
QORI_INLINE Pack<D, n> fit(Pack<int32_t, n> a) {
    if constexpr (sizeof(D) == 4)
        return extend<D>(a);
    else
        return narrow<D>(a);
}

/// To the nearest float; exact up to 24 bits.
template <class S, int n>
QORI_INLINE Pack<float, n> toFloat(Pack<S, n> a) {
    Pack<float, n> out;
    if constexpr (std::is_same_v<S, uint32_t>) {
        // The halves and the product with 2^16 are exact, so that the fused sum rounds once.
        for (int i = 0; i < Pack<float, n>::vectors; ++i) {
            const __m256 high = _mm256_cvtepi32_ps(_mm256_srli_epi32(a.v[i].v, 16));
            const __m256 low = _mm256_cvtepi32_ps(_mm256_and_si256(a.v[i].v, _mm256_set1_epi32(0xFFFF)));
            out.v[i] = {_mm256_fmadd_ps(high, _mm256_set1_ps(65536.0f), low)};
        }
    } else {
        const Pack<int32_t, n> wide = extend<int32_t>(a);
        for (int i = 0; i < Pack<float, n>::vectors; ++i) out.v[i] = {_mm256_cvtepi32_ps(wide.v[i].v)};
    }
    return out;
}

/// Rounding of float lanes to integral values, by mode: as floats, and as 32-bit integers where they fit. None but
/// toInt32 of NearestEven depends on the rounding of the control register; all want subnormals and masked exceptions.
struct TowardZero {
    static QORI_INLINE __m256 round(__m256 x) { return _mm256_round_ps(x, _MM_FROUND_TO_ZERO | _MM_FROUND_NO_EXC); }
    static QORI_INLINE __m256i toInt32(__m256 x) { return _mm256_cvttps_epi32(x); }
};
struct NearestEven {
    static QORI_INLINE __m256 round(__m256 x) {
        return _mm256_round_ps(x, _MM_FROUND_TO_NEAREST_INT | _MM_FROUND_NO_EXC);
    }
    static QORI_INLINE __m256i toInt32(__m256 x) { return _mm256_cvtps_epi32(x); }
};
struct HalfAway {
    /// x minus its integral part is exact, so the comparison with a half is.
    static QORI_INLINE __m256 round(__m256 x) {
        const __m256 whole = TowardZero::round(x), sign = _mm256_set1_ps(-0.0f);
        const __m256 away =
            _mm256_cmp_ps(_mm256_andnot_ps(sign, _mm256_sub_ps(x, whole)), _mm256_set1_ps(0.5f), _CMP_GE_OQ);
        const __m256 one = _mm256_or_ps(_mm256_set1_ps(1.0f), _mm256_and_ps(sign, x));
        return _mm256_add_ps(whole, _mm256_and_ps(away, one));
    }
    static QORI_INLINE __m256i toInt32(__m256 x) { return _mm256_cvttps_epi32(round(x)); }
};

/// Rounded and saturated. A NaN becomes the processor's integer indefinite, -2^31, and then saturates: the type's
/// minimum, 0 for unsigned 8 and 16 bits. 32u: a NaN gives the maximum.
template <class Mode, class D>
QORI_INLINE __m256i roundToInt32(__m256 x) {
    if constexpr (std::is_same_v<D, uint32_t>) {
        const __m256 limit = _mm256_set1_ps(2147483648.0f);
        const __m256 positive = _mm256_max_ps(x, _mm256_setzero_ps());  // NaN and negatives: 0
        const __m256 whole = Mode::round(positive);
        // From 2^31 on floats are integers, and subtracting 2^31 is exact.
        const __m256 big = _mm256_cmp_ps(whole, limit, _CMP_GE_OQ);
        const __m256i low = _mm256_cvttps_epi32(_mm256_sub_ps(whole, _mm256_and_ps(big, limit)));
        const __m256i value = _mm256_xor_si256(low, _mm256_slli_epi32(_mm256_castps_si256(big), 31));
        const __m256 beyond = _mm256_cmp_ps(x, _mm256_set1_ps(4294967296.0f), _CMP_NLT_UQ);  // or a NaN
        return _mm256_or_si256(value, _mm256_castps_si256(beyond));
    } else if constexpr (std::is_same_v<D, int32_t>) {
        const __m256 beyond = _mm256_cmp_ps(x, _mm256_set1_ps(2147483648.0f), _CMP_GE_OQ);
        const __m256i value = Mode::toInt32(x);
        return _mm256_xor_si256(value, _mm256_castps_si256(beyond));  // 0x80000000 to 0x7FFFFFFF
    } else {
        // Below the range the conversion gives -2^31 at worst, which saturates rightly; above it must not.
        const __m256 limited = _mm256_min_ps(_mm256_set1_ps(static_cast<float>(std::numeric_limits<D>::max())), x);
        return Mode::toInt32(limited);
    }
}

template <class Mode, class D, int n>
QORI_INLINE Pack<D, n> roundTo(Pack<float, n> a) {
    Pack<int32_t, n> whole;
    for (int i = 0; i < Pack<float, n>::vectors; ++i) whole.v[i] = {roundToInt32<Mode, D>(a.v[i].v)};
    return fit<D>(whole);
}

}  // namespace qori::kernels
