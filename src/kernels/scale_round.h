// SPDX-License-Identifier: Apache-2.0
// The scaling rule of all integer results: an exact value v, in lanes wider than the element, becomes
//     saturate(v * 2^-scale), rounded to nearest with ties to even,
// by one of four rules that a call chooses once: Saturate (scale 0), LeftShift (below 0), RoundShift and, where its
// addition could leave the lane, RoundShiftSticky (above 0). Scales that turn every value into 0 have no rule.
//
//     withScaleRule<uint8_t, int16_t, 510>(scale, [&](auto rule) { ... narrow<uint8_t>(rule(v.low), rule(v.high)); })
#pragma once
#include <algorithm>
#include <bit>
#include <limits>

#include "simd.h"

namespace qori::kernels {

/// The operations that the rules need on lanes of 16 bits, 32 bits, or signed 64 bits.
template <class W>
struct Lane {
    using V = Vec<W>;
    static constexpr bool isSigned = std::is_signed_v<W>;
    static constexpr int bits = 8 * static_cast<int>(sizeof(W));
    static_assert(bits < 64 || isSigned);

    static QORI_INLINE V all(W value) {
        if constexpr (bits == 16)
            return {_mm256_set1_epi16(static_cast<int16_t>(value))};
        else if constexpr (bits == 32)
            return {_mm256_set1_epi32(static_cast<int32_t>(value))};
        else
            return {_mm256_set1_epi64x(value)};
    }
    static QORI_INLINE V add(V a, V b) {
        if constexpr (bits == 16)
            return {_mm256_add_epi16(a.v, b.v)};
        else if constexpr (bits == 32)
            return {_mm256_add_epi32(a.v, b.v)};
        else
            return {_mm256_add_epi64(a.v, b.v)};
    }
    static QORI_INLINE V shiftLeft(V a, __m128i count) {
        if constexpr (bits == 16)
            return {_mm256_sll_epi16(a.v, count)};
        else if constexpr (bits == 32)
            return {_mm256_sll_epi32(a.v, count)};
        else
            return {_mm256_sll_epi64(a.v, count)};
    }
    /// Floor of a / 2^count: arithmetic where the lane is signed.
    static QORI_INLINE V shiftRight(V a, __m128i count) {
        if constexpr (bits == 16)
            return {isSigned ? _mm256_sra_epi16(a.v, count) : _mm256_srl_epi16(a.v, count)};
        else if constexpr (bits == 32)
            return {isSigned ? _mm256_sra_epi32(a.v, count) : _mm256_srl_epi32(a.v, count)};
        else {  // AVX2 shifts 64 bits only logically: as unsigned from the minimum up
            const __m256i minimum = _mm256_set1_epi64x(INT64_MIN);
            const __m256i raised = _mm256_srl_epi64(_mm256_xor_si256(a.v, minimum), count);
            return {_mm256_sub_epi64(raised, _mm256_srl_epi64(minimum, count))};
        }
    }
    static QORI_INLINE V min(V a, V b) {
        if constexpr (bits == 16)
            return {isSigned ? _mm256_min_epi16(a.v, b.v) : _mm256_min_epu16(a.v, b.v)};
        else if constexpr (bits == 32)
            return {isSigned ? _mm256_min_epi32(a.v, b.v) : _mm256_min_epu32(a.v, b.v)};
        else
            return {_mm256_blendv_epi8(a.v, b.v, _mm256_cmpgt_epi64(a.v, b.v))};
    }
    static QORI_INLINE V max(V a, V b) {
        if constexpr (bits == 16)
            return {isSigned ? _mm256_max_epi16(a.v, b.v) : _mm256_max_epu16(a.v, b.v)};
        else if constexpr (bits == 32)
            return {isSigned ? _mm256_max_epi32(a.v, b.v) : _mm256_max_epu32(a.v, b.v)};
        else
            return {_mm256_blendv_epi8(b.v, a.v, _mm256_cmpgt_epi64(a.v, b.v))};
    }
};

// --- elements to lanes of twice their width and back ----------------------------------------------------------------

/// One vector of elements in two vectors of lanes, in the order that narrow() undoes: the interleaving of the halves
/// for 8 and 16 bits, even and odd elements for 32 bits.
template <class W>
struct Wide {
    Vec<W> low, high;
};

template <class W, class T>
QORI_INLINE Wide<W> widen(Vec<T> a) {
    const __m256i none = _mm256_setzero_si256();
    if constexpr (std::is_same_v<T, uint8_t>) {
        return {{_mm256_unpacklo_epi8(a.v, none)}, {_mm256_unpackhi_epi8(a.v, none)}};
    } else if constexpr (std::is_same_v<T, uint16_t>) {
        return {{_mm256_unpacklo_epi16(a.v, none)}, {_mm256_unpackhi_epi16(a.v, none)}};
    } else if constexpr (std::is_same_v<T, int16_t>) {
        const __m256i sign = _mm256_srai_epi16(a.v, 15);
        return {{_mm256_unpacklo_epi16(a.v, sign)}, {_mm256_unpackhi_epi16(a.v, sign)}};
    } else {
        static_assert(std::is_same_v<T, int32_t>);
        const __m256i sign = _mm256_srai_epi32(a.v, 31);
        return {{_mm256_blend_epi32(a.v, _mm256_slli_epi64(sign, 32), 0xAA)},
                {_mm256_blend_epi32(_mm256_srli_epi64(a.v, 32), sign, 0xAA)}};
    }
}

/// Saturates to the element type. Unsigned lanes hold at most the maximum of the signed lane of their width: every rule
/// leaves them so.
template <class T, class W>
QORI_INLINE Vec<T> narrow(Vec<W> low, Vec<W> high) {
    if constexpr (std::is_same_v<T, uint8_t>) {
        return {_mm256_packus_epi16(low.v, high.v)};
    } else if constexpr (std::is_same_v<T, uint16_t>) {
        return {_mm256_packus_epi32(low.v, high.v)};
    } else if constexpr (std::is_same_v<T, int16_t>) {
        return {_mm256_packs_epi32(low.v, high.v)};
    } else {
        static_assert(std::is_same_v<T, int32_t>);
        const auto clamp = [](Vec<W> a) {
            return Lane<W>::max(Lane<W>::min(a, Lane<W>::all(INT32_MAX)), Lane<W>::all(INT32_MIN));
        };
        return {_mm256_blend_epi32(clamp(low).v, _mm256_slli_epi64(clamp(high).v, 32), 0xAA)};
    }
}

// --- the rules ------------------------------------------------------------------------------------------------------

/// Scale 0. narrow() saturates signed lanes; unsigned ones must first be brought below its limit.
template <class T, class W>
struct Saturate {
    QORI_INLINE Vec<W> operator()(Vec<W> v) const {
        if constexpr (std::is_signed_v<W>)
            return v;
        else
            return Lane<W>::min(v, Lane<W>::all(std::numeric_limits<T>::max()));
    }
};

/// Scale below 0: values that would leave the element are first brought to the nearest that just does, so that the
/// shift stays inside the lane: with n = -scale, (max >> n) + 1 shifted is at most max + 2^n <= 2 * (max + 1). Beyond
/// the element's width (n is cut there) every value but 0 saturates.
template <class T, class W>
struct LeftShift {
    explicit LeftShift(int32_t scale) {
        constexpr int elementBits = 8 * static_cast<int>(sizeof(T));
        const int n = scale < -elementBits ? elementBits : -scale;
        using Limits = std::numeric_limits<T>;
        high = Lane<W>::all(static_cast<W>((int64_t{Limits::max()} >> n) + 1));
        // The floor of min / 2^n is the exact quotient or, past the element's width, -1.
        low = Lane<W>::all(static_cast<W>((int64_t{Limits::min()} >> n) - (Limits::min() < 0)));
        count = _mm_cvtsi32_si128(n);
    }
    QORI_INLINE Vec<W> operator()(Vec<W> v) const {
        v = Lane<W>::min(v, high);
        if constexpr (std::is_signed_v<W>) v = Lane<W>::max(v, low);
        return Lane<W>::shiftLeft(v, count);
    }
    Vec<W> high, low;
    __m128i count;
};

/// Scale above 0: (v + odd + 2^(scale-1) - 1) >> scale, odd being the lowest bit of v >> scale. An exact half reaches
/// the next integer only where odd is 1. |v| + 2^(scale-1) must fit the lane.
template <class W>
struct RoundShift {
    explicit RoundShift(int32_t scale)
        : bias(Lane<W>::all(static_cast<W>((uint64_t{1} << (scale - 1)) - 1))),
          one(Lane<W>::all(1)),
          count(_mm_cvtsi32_si128(scale)) {}
    QORI_INLINE Vec<W> operator()(Vec<W> v) const {
        const Vec<W> odd{_mm256_and_si256(Lane<W>::shiftRight(v, count).v, one.v)};
        return Lane<W>::shiftRight(Lane<W>::add(Lane<W>::add(v, odd), bias), count);
    }
    Vec<W> bias, one;
    __m128i count;
};

/// Scale above 2, any v: halves v first. The bit shifted out stays in the lowest bit, where it keeps telling exact
/// halves from values beside them. |v| / 2 + 2^(scale-2) is at most 3/4 of 2^bits (unsigned lanes, scale up to their
/// width) and 3/4 of 2^(bits-1) (signed ones, scale below it).
template <class W>
struct RoundShiftSticky {
    explicit RoundShiftSticky(int32_t scale) : rest(scale - 1) {}
    QORI_INLINE Vec<W> operator()(Vec<W> v) const {
        const Vec<W> half = Lane<W>::shiftRight(v, _mm_cvtsi32_si128(1));
        return rest({_mm256_or_si256(half.v, _mm256_and_si256(v.v, rest.one.v))});
    }
    RoundShift<W> rest;
};

/// Calls use(rule) with the rule for values of magnitude up to `limit` in lanes W that become elements T. False, and no
/// call, where the scale turns them all into 0.
template <class T, class W, uint64_t limit, class Use>
bool withScaleRule(int32_t scale, Use use) {
    // Past it limit <= 2^(scale-1): no value is above the half, which goes to 0.
    constexpr int lastScale = static_cast<int>(std::bit_width(limit - 1));
    constexpr auto room = static_cast<uint64_t>(std::numeric_limits<W>::max()) - limit;
    constexpr int lastDirect = std::min(lastScale, static_cast<int>(std::bit_width(room)));  // 2^(scale-1) <= room
    static_assert(lastDirect >= 2);
    if (scale > lastScale) return false;
    if (scale == 0)
        use(Saturate<T, W>{});
    else if (scale < 0)
        use(LeftShift<T, W>{scale});
    else if (scale <= lastDirect)
        use(RoundShift<W>{scale});
    else if constexpr (lastDirect < lastScale)
        use(RoundShiftSticky<W>{scale});
    return true;
}

}  // namespace qori::kernels
