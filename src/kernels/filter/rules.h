// SPDX-License-Identifier: Apache-2.0
// What becomes of a filter's sums: rounded and saturated elements. A rule turns the two vectors of a block into
// elements in order; a choice of rules (withRule) names the rounding once per block of rows.
//
// The exact quotient S / d is rounded, though it is computed in floating point. With r the nearest number to 1 / d and
// q = S * r, the remainder e = S - q * d is exact as a fused operation, and q + e * r, rounded once, lies within a
// relative 2^-46 (single) or 2^-104 (double) of S / d before its rounding: a quotient that the format holds, as every
// integer and every half are, comes out exactly. Any other lies at least 1 / (2d) from the nearest integer or half and
// is rounded monotonically, which keeps it on its side while 1 / (2d) exceeds half a unit in the last place, 2^-17 for
// single precision below 256, 2^-10 below 32768, 2^-9 below 65536, and 2^-38 for double precision below 65536; beyond
// the elements' range everything saturates.
//   single: |S| < 2^24 (exact as a float) and |d| < 2^24 / 2^bits for unsigned elements, 2^24 / 2^15 for int16_t
//   double: any 32-bit S and d, elements of 16 bits or less
#pragma once
#include <bit>

#include "taps.h"

namespace qori::kernels {

/// n elements; a whole vector also where they fill it only in part.
template <class T, int n>
struct Elements {
    static constexpr int count = n, bytes = n * static_cast<int>(sizeof(T));
    Vec<T> v[bytes > 32 ? bytes / 32 : 1];
};

/// Calls use with the rounding of a mode; a value that is no mode rounds to nearest.
template <class Use>
QORI_INLINE void withMode(int32_t mode, Use use) {
    if (mode == roundTowardZero)
        use(TowardZero{});
    else if (mode == roundHalfAway)
        use(HalfAway{});
    else
        use(NearestEven{});
}

namespace detail {

/// 32-bit lanes of a block in the order of PairTaps, saturated.
template <class D>
QORI_INLINE Elements<D, 16> packPairs(__m256i low, __m256i high) {
    const __m256i words = std::is_same_v<D, uint16_t> ? _mm256_packus_epi32(low, high) : _mm256_packs_epi32(low, high);
    if constexpr (sizeof(D) == 2)
        return {{{words}}};
    else
        return {{{_mm256_permute4x64_epi64(_mm256_packus_epi16(words, words), 0x08)}}};
}

/// The limit from above keeps results within 32 bits; what is below becomes -2^31. A NaN passes and becomes -2^31 too.
template <class Mode, class D>
QORI_INLINE __m128i roundToInt32(__m256d x) {
    const __m256d limited = _mm256_min_pd(_mm256_set1_pd(static_cast<double>(std::numeric_limits<D>::max())), x);
    if constexpr (std::is_same_v<Mode, TowardZero>) {
        return _mm256_cvttpd_epi32(limited);
    } else if constexpr (std::is_same_v<Mode, NearestEven>) {
        return _mm256_cvtpd_epi32(limited);
    } else {
        const __m256d whole = _mm256_round_pd(limited, _MM_FROUND_TO_ZERO | _MM_FROUND_NO_EXC);
        const __m256d sign = _mm256_set1_pd(-0.0);
        const __m256d rest = _mm256_andnot_pd(sign, _mm256_sub_pd(limited, whole));  // exact
        const __m256d away = _mm256_cmp_pd(rest, _mm256_set1_pd(0.5), _CMP_GE_OQ);
        const __m256d one = _mm256_or_pd(_mm256_set1_pd(1.0), _mm256_and_pd(sign, limited));
        return _mm256_cvttpd_epi32(_mm256_add_pd(whole, _mm256_and_pd(away, one)));
    }
}

}  // namespace detail

/// Integer sums as they are.
template <class D>
struct Saturated {
    using Element = D;
    static constexpr bool isCopy = false;

    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        use([](const Vec<int32_t>(&s)[2]) { return detail::packPairs<D>(s[0].v, s[1].v); });
    }
};

/// Integer sums by 2^shift, shift 1 to 30: q = floor(S / 2^shift) plus 1 where the rest of at most 2^shift - 1 and a
/// bias of at most 2^shift - 1 reach 2^shift; below 2^31 in all.
template <class D>
struct Shifted {
    using Element = D;
    static constexpr bool isCopy = false;
    int32_t shift, mode;

    template <class Mode>
    static QORI_INLINE __m256i round(__m256i s, __m128i count, __m256i mask) {
        const __m256i q = _mm256_sra_epi32(s, count), rest = _mm256_and_si256(s, mask);
        const __m256i negative = _mm256_srai_epi32(s, 31);
        __m256i bias;
        if constexpr (std::is_same_v<Mode, TowardZero>) {
            bias = _mm256_and_si256(negative, mask);
        } else if constexpr (std::is_same_v<Mode, NearestEven>) {
            const __m256i odd = _mm256_and_si256(q, _mm256_set1_epi32(1));
            bias = _mm256_add_epi32(_mm256_srli_epi32(mask, 1), odd);
        } else {  // half up for positive sums, half down for negative ones
            bias = _mm256_add_epi32(_mm256_sub_epi32(mask, _mm256_srli_epi32(mask, 1)), negative);
        }
        return _mm256_add_epi32(q, _mm256_srl_epi32(_mm256_add_epi32(rest, bias), count));
    }
    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        const __m128i count = _mm_cvtsi32_si128(shift);
        const __m256i mask = _mm256_set1_epi32((1 << shift) - 1);
        withMode(mode, [&]<class Mode>(Mode) {
            use([=](const Vec<int32_t>(&s)[2]) {
                return detail::packPairs<D>(round<Mode>(s[0].v, count, mask), round<Mode>(s[1].v, count, mask));
            });
        });
    }
};

/// Integer sums below 2^24 by a divisor, in single precision.
template <class D>
struct QuotientInSingle {
    using Element = D;
    static constexpr bool isCopy = false;
    int32_t divisor, mode;

    static constexpr uint32_t kRange = uint32_t{std::numeric_limits<D>::max()} + 1;
    static constexpr int64_t kSumLimit = int64_t{1} << 24;

    QuotientInSingle(int32_t d, int32_t m) : divisor(d), mode(m) {}
    uint32_t magnitude() const {
        return divisor < 0 ? 0 - static_cast<uint32_t>(divisor) : static_cast<uint32_t>(divisor);
    }
    bool isPowerOfTwo() const { return std::has_single_bit(magnitude()); }
    /// Whether the quotients of sums below the limit are rounded rightly.
    bool isExact() const { return magnitude() < (1u << 24) / kRange || isPowerOfTwo(); }
    /// Whether S * r rounds as S / d does. With d a power of two the product is exact. An odd d knows no halves, and
    /// the product's relative error of at most 2^-23 is less than 1 / (2d) below the range.
    bool isSimple() const {
        return isPowerOfTwo() || (mode == roundNearestEven && divisor % 2 != 0 && magnitude() < (1u << 22) / kRange);
    }
    template <class Mode, bool simple>
    QORI_INLINE auto rule() const {
        const __m256 d = _mm256_set1_ps(static_cast<float>(divisor)),
                     r = _mm256_set1_ps(1.0f / static_cast<float>(divisor));
        return [=](const Vec<int32_t>(&sums)[2]) {
            __m256i whole[2];
            for (int k = 0; k < 2; ++k) {
                const __m256 s = _mm256_cvtepi32_ps(sums[k].v);
                __m256 q = _mm256_mul_ps(s, r);
                if constexpr (!simple) q = _mm256_fmadd_ps(_mm256_fnmadd_ps(q, d, s), r, q);
                whole[k] = Mode::toInt32(q);
            }
            return detail::packPairs<D>(whole[0], whole[1]);
        };
    }
    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        const bool simple = isSimple();
        withMode(mode, [&]<class Mode>(Mode) {
            if (simple)
                use(rule<Mode, true>());
            else
                use(rule<Mode, false>());
        });
    }
};

/// Integer sums by any divisor, in double precision.
template <class D>
struct QuotientInDouble {
    static_assert(sizeof(D) <= 2);
    using Element = D;
    static constexpr bool isCopy = false;
    int32_t divisor, mode;

    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        const __m256d d = _mm256_set1_pd(divisor), r = _mm256_set1_pd(1.0 / divisor);
        withMode(mode, [&]<class Mode>(Mode) {
            const auto quotient = [=](__m128i sums) {
                const __m256d s = _mm256_cvtepi32_pd(sums), q = _mm256_mul_pd(s, r);
                return detail::roundToInt32<Mode, D>(_mm256_fmadd_pd(_mm256_fnmadd_pd(q, d, s), r, q));
            };
            use([=](const Vec<int32_t>(&sums)[2]) {
                __m256i whole[2];
                for (int k = 0; k < 2; ++k)
                    whole[k] = _mm256_set_m128i(quotient(_mm256_extracti128_si256(sums[k].v, 1)),
                                                quotient(_mm256_castsi256_si128(sums[k].v)));
                return detail::packPairs<D>(whole[0], whole[1]);
            });
        });
    }
};

/// Sums of ByteTaps to bytes by a small divisor, in 16 bits. Below 0 everything saturates; above, with t = S for
/// truncation and S + floor(d / 2) for rounding, t < 2^15, the quotient is floor(t / d) = t * m >> (16 + s), where
/// 2^s < d <= 2^(s + 1) and m is the first integer above 2^(16 + s) / d: m * d exceeds 2^(16 + s) by 2^(s + 1) at most
/// (Granlund and Montgomery, Division by invariant integers using multiplication, 1994). Where d is even and divides t,
/// S lies in the middle.
struct QuotientInWords {
    using Element = uint8_t;
    static constexpr bool isCopy = false;
    static constexpr int64_t kSumLimit = ByteTaps::kSumLimit;
    static constexpr int32_t kMost = 2 * (INT16_MAX - static_cast<int32_t>(kSumLimit));
    int32_t divisor, mode;

    bool isExact() const { return divisor > 1 && divisor <= kMost; }

    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        const int shift = static_cast<int>(std::bit_width(static_cast<uint32_t>(divisor - 1))) - 1;
        const auto factor = static_cast<int16_t>((uint32_t{1} << (16 + shift)) / static_cast<uint32_t>(divisor) + 1);
        const __m256i m = _mm256_set1_epi16(factor), d = _mm256_set1_epi16(static_cast<int16_t>(divisor));
        const __m256i half = _mm256_set1_epi16(static_cast<int16_t>(mode == roundTowardZero ? 0 : divisor / 2));
        const __m128i count = _mm_cvtsi32_si128(shift);
        const auto quotient = [=](Vec<int16_t> s, bool toEven) {
            const __m256i t = _mm256_add_epi16(_mm256_max_epi16(s.v, _mm256_setzero_si256()), half);
            const __m256i q = _mm256_srl_epi16(_mm256_mulhi_epu16(t, m), count);
            if (!toEven) return q;
            const __m256i middle = _mm256_cmpeq_epi16(_mm256_mullo_epi16(q, d), t);
            return _mm256_sub_epi16(q, _mm256_and_si256(_mm256_and_si256(q, middle), _mm256_set1_epi16(1)));
        };
        const auto packed = [=](const Vec<int16_t>(&s)[2], bool toEven) -> Elements<uint8_t, 32> {
            return {{{_mm256_packus_epi16(quotient(s[0], toEven), quotient(s[1], toEven))}}};
        };
        if (mode == roundNearestEven && divisor % 2 == 0)
            use([=](const Vec<int16_t>(&s)[2]) { return packed(s, true); });
        else
            use([=](const Vec<int16_t>(&s)[2]) { return packed(s, false); });
    }
};

/// Sums of ByteTaps, or their totals by groups, to bytes by a rule for 32 bits.
template <class Rule, class Sum>
struct Widened {
    using Element = uint8_t;
    static constexpr bool isCopy = false;
    Rule rule;

    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        rule.withRule([&](auto convert) {
            const auto half = [=](const Sum& s) { return _mm256_castsi256_si128(convert(WideSum::of(s).v).v[0].v); };
            use([=](const Sum(&s)[2]) -> Elements<uint8_t, 32> {
                const __m128i outer = half(s[0]), inner = half(s[1]);  // 0-7, 16-23 and 8-15, 24-31
                return {{{_mm256_set_m128i(_mm_unpackhi_epi64(outer, inner), _mm_unpacklo_epi64(outer, inner))}}};
            });
        });
    }
};

/// Floating-point sums as they are.
template <class D>
struct Kept {
    using Element = D;
    static constexpr bool isCopy = true;

    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        use([](const Vec<D>(&s)[2]) { return Elements<D, 2 * Vec<D>::lanes>{{s[0], s[1]}}; });
    }
};

/// Single-precision sums to integers of 8 or 16 bits. A NaN becomes the type's minimum.
template <class D>
struct Rounded {
    using Element = D;
    static constexpr bool isCopy = false;
    int32_t mode;

    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        withMode(mode, [&]<class Mode>(Mode) {
            use([](const Vec<float>(&s)[2]) -> Elements<D, 16> {
                const Vec<int32_t> whole[2] = {{roundToInt32<Mode, D>(s[0].v)}, {roundToInt32<Mode, D>(s[1].v)}};
                if constexpr (sizeof(D) == 2) {
                    return {{narrowPair<D>(whole[0], whole[1])}};
                } else {
                    const Vec<int16_t> words = narrowPair<int16_t>(whole[0], whole[1]);
                    return {{narrowPair<D>(words, words)}};
                }
            });
        });
    }
};

/// Double-precision sums by a divisor, to integers of up to 32 bits. A NaN becomes the type's minimum.
template <class D>
struct Divided {
    using Element = D;
    static constexpr bool isCopy = false;
    int32_t divisor, mode;

    template <class Use>
    QORI_INLINE void withRule(Use use) const {
        const __m256d d = _mm256_set1_pd(divisor);
        withMode(mode, [&]<class Mode>(Mode) {
            use([=](const Vec<double>(&s)[2]) -> Elements<D, 8> {
                const __m128i low = detail::roundToInt32<Mode, D>(_mm256_div_pd(s[0].v, d));
                const __m128i high = detail::roundToInt32<Mode, D>(_mm256_div_pd(s[1].v, d));
                if constexpr (sizeof(D) == 4) {
                    return {{{_mm256_set_m128i(high, low)}}};
                } else {
                    const __m128i words =
                        std::is_same_v<D, uint16_t> ? _mm_packus_epi32(low, high) : _mm_packs_epi32(low, high);
                    return {{{_mm256_castsi128_si256(sizeof(D) == 2 ? words : _mm_packus_epi16(words, words))}}};
                }
            });
        });
    }
};

// --- rows -----------------------------------------------------------------------------------------------------------

namespace detail {

/// The first `count` elements, all of them where count reaches n.
template <bool keepAlpha, class D, int n>
QORI_INLINE void storeElements(D* p, Elements<D, n> e, ptrdiff_t count) {
    constexpr int lanes = Vec<D>::lanes;
    for (int k = 0; k * lanes < n; ++k) {
        const ptrdiff_t here = std::min<ptrdiff_t>(count, n) - k * lanes;
        if constexpr (keepAlpha) e.v[k] = withAlphaOf(e.v[k], loadUpTo(p + k * lanes, here));
        if constexpr (n < lanes) {
            const __m128i low = _mm256_castsi256_si128(toInteger(e.v[k].v));
            if (count >= n && n * sizeof(D) == 16) return _mm_storeu_si128(reinterpret_cast<__m128i*>(p), low);
            if (count >= n && n * sizeof(D) == 8) return _mm_storel_epi64(reinterpret_cast<__m128i*>(p), low);
        }
        storeUpTo(p + k * lanes, e.v[k], here);
    }
}

}  // namespace detail

/// A row of sums to elements: Finish (sums.h) with a rule.
template <class Rule, bool keepAlpha, class Sum>
void finishRow(const void* rule, const Sum (*slots)[2], uint8_t* dst, ptrdiff_t elements) {
    using D = typename Rule::Element;
    auto* const out = reinterpret_cast<D*>(dst);
    static_cast<const Rule*>(rule)->withRule([&](auto convert) {
        constexpr ptrdiff_t block = decltype(convert(*slots))::count;
        ptrdiff_t x = 0;
        for (; x <= elements - block; x += block) detail::storeElements<keepAlpha>(out + x, convert(*slots++), block);
        if (x == elements) return;
        x = std::max<ptrdiff_t>(elements - block, 0);
        detail::storeElements<keepAlpha>(out + x, convert(*slots), elements - x);
    });
}

}  // namespace qori::kernels
