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

#include "vector_math.h"

namespace qori::kernels {

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
        const auto clamp = [](Vec<W> a) { return larger(smaller(a, splat<W>(INT32_MAX)), splat<W>(INT32_MIN)); };
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
            return smaller(v, splat<W>(std::numeric_limits<T>::max()));
    }
};

/// Scale below 0: values that would leave the element are first brought to the nearest that just does, so that the
/// shift stays inside the lane: with n = -scale, (max >> n) + 1 shifted is at most max + 2^n <= 2 * (max + 1). Beyond
/// the element's width (n is cut there) every value but 0 saturates.
template <class T, class W>
struct LeftShift {
    explicit LeftShift(int32_t scale) : LeftShift(Bits{scale < -elementBits ? elementBits : -scale}) {}
    QORI_INLINE Vec<W> operator()(Vec<W> v) const {
        v = smaller(v, high);
        if constexpr (std::is_signed_v<W>) v = larger(v, low);
        return shiftLeft(v, count);
    }

private:
    static constexpr int elementBits = 8 * static_cast<int>(sizeof(T));
    using Limits = std::numeric_limits<T>;
    struct Bits {
        int n;
    };

    // The floor of min / 2^n is the exact quotient or, past the element's width, -1.
    explicit LeftShift(Bits shift)
        : high(splat(static_cast<W>((int64_t{Limits::max()} >> shift.n) + 1))),
          low(splat(static_cast<W>((int64_t{Limits::min()} >> shift.n) - (Limits::min() < 0)))),
          count(shift.n) {}

    Vec<W> high, low;
    ShiftCount count;
};

/// Scale above 0: (v + odd + 2^(scale-1) - 1) >> scale, odd being the lowest bit of v >> scale. An exact half reaches
/// the next integer only where odd is 1. |v| + 2^(scale-1) must fit the lane.
template <class W>
struct RoundShift {
    explicit RoundShift(int32_t scale)
        : bias(splat(static_cast<W>((uint64_t{1} << (scale - 1)) - 1))), one(splat<W>(1)), count(scale) {}
    QORI_INLINE Vec<W> operator()(Vec<W> v) const {
        const Vec<W> odd = shiftRight(v, count) & one;
        return shiftRight(v + odd + bias, count);
    }
    Vec<W> bias, one;
    ShiftCount count;
};

/// Scale above 2, any v: halves v first. The bit shifted out stays in the lowest bit, where it keeps telling exact
/// halves from values beside them. |v| / 2 + 2^(scale-2) is at most 3/4 of 2^bits (unsigned lanes, scale up to their
/// width) and 3/4 of 2^(bits-1) (signed ones, scale below it).
template <class W>
struct RoundShiftSticky {
    explicit RoundShiftSticky(int32_t scale) : rest(scale - 1) {}
    QORI_INLINE Vec<W> operator()(Vec<W> v) const { return rest(shiftRight(v, ShiftCount(1)) | (v & rest.one)); }
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
