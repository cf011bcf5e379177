// SPDX-License-Identifier: Apache-2.0
// Quotients of elements: second / first * 2^-scale, rounded from the exact rational number.
//
// Integers go through one floating-point division. A quotient x = N / D (scaling by a power of two is exact) that is
// not halfway between integers is away from the nearest half by at least 1 / (2 D), that is x / (2 N). The
// division is off by less than x * 2^-23 in float and x * 2^-52 in double, whatever the rounding mode, and cannot jump
// over a half, which it represents. So the rounded quotient is exact where N < 2^22 or N < 2^51. Where N is larger
// because the scale is negative, only quotients that do not saturate matter: N <= 2 D * max.
//     8u     N <= 2^8 * 2 * 2^8               float
//     16u 16s  scale >= -6: N < 2^16 * 2^6    float; below: N <= 2^16 * 2 * 2^16   double
//     16sc   N <= 2^31, or 2^31 * 2 * 2^15    double
// Whole numbers are farther away, x / N, so that truncation is exact too.
//
// A divisor of 0 acts as 2^-60, scale and all: any numerator but 0 saturates by its sign, 0 gives 0, and nothing traps.
#pragma once
#include "arith.h"

namespace qori::kernels {

constexpr double kTiny = 0x1p-60;

/// Scales past these ends make no difference to numerators and divisors up to 2^31; and every scaled divisor is above
/// the tiny one.
constexpr int kLeastScale = -48, kMostScale = 33;

/// What a division has met: which elements had a zero divisor, by their place among the lanes.
struct ZeroDivisors {
    __m256i seen = _mm256_setzero_si256();

    /// Behind a branch, because the state lives in memory and would bind each block to the one before.
    QORI_INLINE void note(__m256i isZero) {
        if (!_mm256_testz_si256(isZero, isZero)) seen = _mm256_or_si256(seen, isZero);
    }

    /// Only the first `count` elements of a tail are there.
    template <class T>
    QORI_INLINE void noteFirst(__m256i isZero, ptrdiff_t count) {
        const __m256i index = _mm256_setr_epi8(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16, 17, 18, 19, 20,
                                               21, 22, 23, 24, 25, 26, 27, 28, 29, 30, 31);
        const auto bytes = static_cast<int8_t>(count * static_cast<ptrdiff_t>(sizeof(T)));
        note(_mm256_and_si256(isZero, _mm256_cmpgt_epi8(_mm256_set1_epi8(bytes), index)));
    }

    /// Whether any was met; fourth channels do not count where they are kept.
    template <bool keepAlpha, class T>
    bool any() const {
        Vec<T> counted = fromInteger<T>(seen);
        if constexpr (keepAlpha) counted = detail::withAlphaOf(counted, zero<T>());
        return !_mm256_testz_si256(toInteger(counted.v), toInteger(counted.v));
    }
};

// --- rounding of float vectors, independent of the control register -------------------------------------------------

constexpr int kToZero = _MM_FROUND_TO_ZERO | _MM_FROUND_NO_EXC, kToEven = _MM_FROUND_TO_NEAREST_INT | _MM_FROUND_NO_EXC;

QORI_INLINE Vec<float> truncate(Vec<float> x) { return {_mm256_round_ps(x.v, kToZero)}; }
QORI_INLINE Vec<double> truncate(Vec<double> x) { return {_mm256_round_pd(x.v, kToZero)}; }
QORI_INLINE Vec<float> roundToEven(Vec<float> x) { return {_mm256_round_ps(x.v, kToEven)}; }
QORI_INLINE Vec<double> roundToEven(Vec<double> x) { return {_mm256_round_pd(x.v, kToEven)}; }

/// The fraction x - trunc(x) is exact; from 1/2 on, one more with the sign of x.
QORI_INLINE Vec<float> roundHalfFromZero(Vec<float> x) {
    const __m256 sign = _mm256_set1_ps(-0.f), whole = truncate(x).v;
    const __m256 fraction = _mm256_andnot_ps(sign, _mm256_sub_ps(x.v, whole));
    const __m256 away = _mm256_and_ps(_mm256_cmp_ps(fraction, _mm256_set1_ps(.5f), _CMP_GE_OQ), _mm256_set1_ps(1));
    return {_mm256_add_ps(whole, _mm256_or_ps(away, _mm256_and_ps(x.v, sign)))};
}
QORI_INLINE Vec<double> roundHalfFromZero(Vec<double> x) {
    const __m256d sign = _mm256_set1_pd(-0.), whole = truncate(x).v;
    const __m256d fraction = _mm256_andnot_pd(sign, _mm256_sub_pd(x.v, whole));
    const __m256d away = _mm256_and_pd(_mm256_cmp_pd(fraction, _mm256_set1_pd(.5), _CMP_GE_OQ), _mm256_set1_pd(1));
    return {_mm256_add_pd(whole, _mm256_or_pd(away, _mm256_and_pd(x.v, sign)))};
}

template <QorRoundingMode mode, class F>
QORI_INLINE Vec<F> rounded(Vec<F> x) {
    if constexpr (mode == roundTowardZero)
        return truncate(x);
    else if constexpr (mode == roundHalfAway)
        return roundHalfFromZero(x);
    else
        return roundToEven(x);
}

// --- 8u, 16u, 16s ---------------------------------------------------------------------------------------------------

/// Eight divisors in floats, scaled.
template <class F>
struct Divisors;
template <>
struct Divisors<float> {
    __m256 all;
};
template <>
struct Divisors<double> {
    __m256d low, high;
};

/// Quotients of eight 32-bit integers, rounded and clamped to the range of T. The scale goes to the divisors: there it
/// is no work where they are constants.
template <class T, QorRoundingMode mode, class F>
struct Quotients {
    explicit Quotients(int32_t scale)
        : factor(static_cast<F>(powerOfTwo(std::clamp(scale, kLeastScale, kMostScale)))) {}

    QORI_INLINE Divisors<F> prepare(__m256i d) const {
        if constexpr (std::is_same_v<F, float>) {
            return {nonZero(_mm256_mul_ps(_mm256_cvtepi32_ps(d), _mm256_set1_ps(factor)))};
        } else {
            const auto half = [&](__m128i h) {
                return nonZero(_mm256_mul_pd(_mm256_cvtepi32_pd(h), _mm256_set1_pd(factor)));
            };
            return {half(_mm256_castsi256_si128(d)), half(_mm256_extracti128_si256(d, 1))};
        }
    }
    QORI_INLINE __m256i operator()(__m256i n, const Divisors<F>& d) const {
        if constexpr (std::is_same_v<F, float>) {
            __m256 x = _mm256_div_ps(_mm256_cvtepi32_ps(n), d.all);
            if constexpr (std::is_signed_v<T>) x = _mm256_max_ps(x, _mm256_set1_ps(least));
            return _mm256_cvttps_epi32(rounded<mode>(Vec<float>{_mm256_min_ps(x, _mm256_set1_ps(most))}).v);
        } else {
            const auto half = [](__m128i h, __m256d divisor) {
                const __m256d x = _mm256_max_pd(_mm256_div_pd(_mm256_cvtepi32_pd(h), divisor), _mm256_set1_pd(least));
                return _mm256_cvttpd_epi32(rounded<mode>(Vec<double>{_mm256_min_pd(x, _mm256_set1_pd(most))}).v);
            };
            const __m128i low = half(_mm256_castsi256_si128(n), d.low);
            return _mm256_set_m128i(half(_mm256_extracti128_si256(n, 1), d.high), low);
        }
    }

private:
    static constexpr T least = std::numeric_limits<T>::min(), most = std::numeric_limits<T>::max();

    static QORI_INLINE __m256 nonZero(__m256 d) {
        const __m256 tiny = _mm256_set1_ps(static_cast<float>(kTiny));
        if constexpr (!std::is_signed_v<T>)
            return _mm256_max_ps(d, tiny);
        else
            return _mm256_blendv_ps(d, tiny, _mm256_cmp_ps(d, _mm256_setzero_ps(), _CMP_EQ_OQ));
    }
    static QORI_INLINE __m256d nonZero(__m256d d) {
        return _mm256_blendv_pd(d, _mm256_set1_pd(kTiny), _mm256_cmp_pd(d, _mm256_setzero_pd(), _CMP_EQ_OQ));
    }
    F factor;
};

/// second / first of real integers.
template <class T, QorRoundingMode mode, class F>
struct DivideIntegers {
    static constexpr int eights = Vec<T>::lanes / 8;
    /// The divisors of one vector of elements, in the order of widen().
    struct Prepared {
        Divisors<F> eight[eights];
    };

    explicit DivideIntegers(int32_t scale) : quotients(scale) {}

    static QORI_INLINE __m256i zeroDivisors(Vec<T> first) {
        const __m256i none = _mm256_setzero_si256();
        return sizeof(T) == 1 ? _mm256_cmpeq_epi8(first.v, none) : _mm256_cmpeq_epi16(first.v, none);
    }
    QORI_INLINE Vec<T> operator()(Vec<T> first, Vec<T> second) const { return apply(prepare(first), second); }

    QORI_INLINE Prepared prepare(Vec<T> first) const {
        if constexpr (sizeof(T) == 1) {
            const Wide<uint16_t> d = widen<uint16_t>(first);
            const Wide<int32_t> low = widen<int32_t>(d.low), high = widen<int32_t>(d.high);
            return {{prepare(low.low), prepare(low.high), prepare(high.low), prepare(high.high)}};
        } else {
            const Wide<int32_t> d = widen<int32_t>(first);
            return {{prepare(d.low), prepare(d.high)}};
        }
    }
    QORI_INLINE Vec<T> apply(const Prepared& first, Vec<T> second) const {
        if constexpr (sizeof(T) == 1) {
            const Wide<uint16_t> n = widen<uint16_t>(second);
            return narrow<uint8_t>(divide(first.eight, n.low), divide(first.eight + 2, n.high));
        } else {
            return divide(first.eight, second);
        }
    }

private:
    QORI_INLINE Divisors<F> prepare(Vec<int32_t> d) const { return quotients.prepare(d.v); }

    template <class H>
    QORI_INLINE Vec<H> divide(const Divisors<F>* d, Vec<H> second) const {
        const Wide<int32_t> n = widen<int32_t>(second);
        return narrow<H>(Vec<int32_t>{quotients(n.low.v, d[0])}, Vec<int32_t>{quotients(n.high.v, d[1])});
    }
    Quotients<T, mode, F> quotients;
};

/// Calls use(divide) with the division of integers T.
template <class T, QorRoundingMode mode, class Use>
void withRoundedDivision(int32_t scale, Use use) {
    if (sizeof(T) == 1 || scale >= -6)
        use(DivideIntegers<T, mode, float>{scale});
    else if constexpr (sizeof(T) != 1)
        use(DivideIntegers<T, mode, double>{scale});
}

// --- complex integers -----------------------------------------------------------------------------------------------

/// With first = a + bi and second = c + di: ((ca + db) + (da - cb)i) / (a^2 + b^2). A zero divisor gives each part the
/// saturation of its own numerator part.
struct DivideComplex16 {
    explicit DivideComplex16(int32_t scale) : factor(powerOfTwo(-std::clamp(scale, kLeastScale, kMostScale))) {}

    static QORI_INLINE __m256i zeroDivisors(Vec<QorComplex16s> first) {
        return _mm256_cmpeq_epi32(first.v, _mm256_setzero_si256());
    }
    /// |da - cb| <= 2^30 + 2^15 (2^15 - 1); ca + db and a^2 + b^2 reach 2^31, which fits after 1 is taken off: their
    /// least values are 2^16 - 2^31 and 0. da - cb comes as da + c(-b - 1) + c, because -b need not fit 16 bits.
    QORI_INLINE Vec<QorComplex16s> operator()(Vec<QorComplex16s> first, Vec<QorComplex16s> second) const {
        const __m256i y = first.v, x = second.v, one = _mm256_set1_epi32(1);
        const __m256i conjugate = _mm256_xor_si256(y, _mm256_set1_epi32(static_cast<int32_t>(0xFFFF0000u)));
        const __m256i crossed = detail::swapParts({conjugate}).v;
        const __m256i realPart = _mm256_srai_epi32(_mm256_slli_epi32(x, 16), 16);
        const __m256i real = _mm256_sub_epi32(_mm256_madd_epi16(x, y), one);
        const __m256i imaginary = _mm256_add_epi32(_mm256_madd_epi16(x, crossed), realPart);
        const __m256i norm = _mm256_sub_epi32(_mm256_madd_epi16(y, y), one);
        // Where the divisor is zero the sums are too, and the parts of the numerator take their place.
        const __m256i none = zeroDivisors(first);
        const __m256i c = _mm256_and_si256(none, realPart);
        const __m256i d = _mm256_and_si256(none, _mm256_srai_epi32(x, 16));
        const auto half = [&](auto part) {
            const __m256d divisor = _mm256_max_pd(plusOne(part(norm)), _mm256_set1_pd(kTiny));
            const __m128i re = quotient(plusOne(part(_mm256_add_epi32(real, c))), divisor);
            const __m128i im = quotient(_mm256_cvtepi32_pd(part(_mm256_add_epi32(imaginary, d))), divisor);
            return _mm_packs_epi32(_mm_unpacklo_epi32(re, im), _mm_unpackhi_epi32(re, im));
        };
        const __m128i low = half([](__m256i v) { return _mm256_castsi256_si128(v); });
        return {_mm256_set_m128i(half([](__m256i v) { return _mm256_extracti128_si256(v, 1); }), low)};
    }

private:
    static QORI_INLINE __m256d plusOne(__m128i v) { return _mm256_add_pd(_mm256_cvtepi32_pd(v), _mm256_set1_pd(1)); }
    QORI_INLINE __m128i quotient(__m256d n, __m256d d) const {
        const __m256d x = _mm256_div_pd(_mm256_mul_pd(n, _mm256_set1_pd(factor)), d);
        const __m256d clamped = _mm256_min_pd(_mm256_max_pd(x, _mm256_set1_pd(INT16_MIN)), _mm256_set1_pd(INT16_MAX));
        return _mm256_cvttpd_epi32(roundToEven(Vec<double>{clamped}).v);
    }
    double factor;
};

/// One quotient in integers.
QorComplex32s divideExactly(QorComplex32s divisor, QorComplex32s numerator, int32_t scale);

/// In double precision, with a bound of its error. With A = |ca| + |db| the sum ca + db is off by at most 2 u A,
/// u = 2^-52 for any rounding mode; factor / norm by 3 u of itself; their product q by u more: together by less than
/// 8 u A factor / norm. Where q comes too near to k + 1/2, k = floor(q), the sign of
///     D = 2 (ca + db) 2^-scale - (2 k + 1) norm        (the power on the other side where scale is above 0)
/// decides. While q is off by less than 1/4, |D| is below norm <= 2^63, or below 2^16 for scales above 0: arithmetic
/// modulo 2^64 gives it exactly. What is less certain and may not saturate is divided in integers.
struct DivideComplex32 {
    explicit DivideComplex32(int32_t scaleFactor)
        : scale(scaleFactor), factor(powerOfTwo(-std::clamp(scale, -100, 100))) {}

    static QORI_INLINE __m256i zeroDivisors(Vec<QorComplex32s> first) {
        return _mm256_cmpeq_epi64(first.v, _mm256_setzero_si256());
    }
    QORI_INLINE Vec<QorComplex32s> operator()(Vec<QorComplex32s> first, Vec<QorComplex32s> second) const {
        __m256d unsure = _mm256_setzero_pd();
        const __m128i low = two(_mm256_castsi256_si128(first.v), _mm256_castsi256_si128(second.v), unsure);
        const __m128i high = two(_mm256_extracti128_si256(first.v, 1), _mm256_extracti128_si256(second.v, 1), unsure);
        if (!_mm256_testz_pd(unsure, unsure)) [[unlikely]]
            return exactly(first, second);
        const Vec<QorComplex32s> quotients{_mm256_set_m128i(high, low)};
        const __m256i none = zeroDivisors(first);
        return _mm256_testz_si256(none, none) ? quotients : withLimits(quotients, second, none);
    }

private:
    /// Quotients over zero by the sign of the numerator's part, and 0 for 0.
    static QORI_INLINE Vec<QorComplex32s> withLimits(Vec<QorComplex32s> quotients, Vec<QorComplex32s> second,
                                                     __m256i none) {
        const __m256i x = second.v;
        const __m256i limit = _mm256_xor_si256(_mm256_srai_epi32(x, 31), _mm256_set1_epi32(INT32_MAX));
        const __m256i overZero = _mm256_andnot_si256(_mm256_cmpeq_epi32(x, _mm256_setzero_si256()), limit);
        return {_mm256_blendv_epi8(quotients.v, overZero, none)};
    }
    QORI_INLINE __m128i two(__m128i first, __m128i second, __m256d& unsure) const {
        const __m256d y = _mm256_cvtepi32_pd(first), x = _mm256_cvtepi32_pd(second), sign = _mm256_set1_pd(-0.);
        const __m256d squares = _mm256_mul_pd(y, y), norm = _mm256_add_pd(squares, _mm256_permute_pd(squares, 0x5));
        const __m256d inverse = _mm256_div_pd(_mm256_set1_pd(factor), _mm256_max_pd(norm, _mm256_set1_pd(1)));
        const __m256d byReal = _mm256_mul_pd(x, _mm256_movedup_pd(y));                                    // ca, da
        const __m256d byImaginary = _mm256_mul_pd(_mm256_permute_pd(x, 0x5), _mm256_permute_pd(y, 0xF));  // db, cb
        const __m256d sum = _mm256_addsub_pd(byReal, _mm256_xor_pd(byImaginary, sign));
        const __m256d size = _mm256_add_pd(_mm256_andnot_pd(sign, byReal), _mm256_andnot_pd(sign, byImaginary));
        const __m256d q = _mm256_mul_pd(sum, inverse);
        const __m256d error = _mm256_mul_pd(_mm256_mul_pd(size, inverse), _mm256_set1_pd(0x1p-49));
        __m256d whole = roundToEven(Vec<double>{q}).v;
        const __m256d off = _mm256_andnot_pd(sign, _mm256_sub_pd(q, whole));
        const __m256d isNear = _mm256_cmp_pd(_mm256_add_pd(off, error), _mm256_set1_pd(.5), _CMP_NLT_UQ);
        if (!_mm256_testz_pd(isNear, isNear)) {
            const __m256d tooLarge = _mm256_cmp_pd(_mm256_max_pd(size, norm), _mm256_set1_pd(0x1p53), _CMP_GT_OQ);
            const __m256d beside =
                _mm256_testz_pd(isNear, tooLarge) ? besideHalf(sum, norm, q) : besideHalf(first, second, q);
            whole = _mm256_blendv_pd(whole, beside, isNear);
            const __m256d vague = _mm256_cmp_pd(error, _mm256_set1_pd(.25), _CMP_GE_OQ);
            const __m256d surely = _mm256_sub_pd(_mm256_andnot_pd(sign, q), error);  // |q| is at least that
            const __m256d mayFit = _mm256_cmp_pd(surely, _mm256_set1_pd(0x1p32), _CMP_NGT_UQ);
            unsure = _mm256_or_pd(unsure, _mm256_and_pd(vague, mayFit));
        }
        const __m256d least = _mm256_set1_pd(INT32_MIN), most = _mm256_set1_pd(INT32_MAX);
        return _mm256_cvttpd_epi32(_mm256_min_pd(_mm256_max_pd(whole, least), most));
    }

    /// k or k + 1, as D says, which is computed halved here. With sum and norm exact, up to 2^53, it is one fused step
    /// and has the right sign. Where q is beyond 2^51 D is not D, and both saturate.
    QORI_INLINE __m256d besideHalf(__m256d sum, __m256d norm, __m256d q) const {
        const __m256d half = _mm256_add_pd(_mm256_floor_pd(q), _mm256_set1_pd(.5)), zero = _mm256_setzero_pd();
        const __m256d d = _mm256_fnmadd_pd(half, norm, _mm256_mul_pd(sum, _mm256_set1_pd(factor)));
        const __m256d up = _mm256_ceil_pd(half), even = roundToEven(Vec<double>{half}).v;
        const __m256d decided = _mm256_blendv_pd(up, _mm256_floor_pd(half), d);  // by its sign
        return _mm256_blendv_pd(decided, even, _mm256_cmp_pd(d, zero, _CMP_EQ_OQ));
    }
    /// The same for any sum.
    QORI_NOINLINE __m256d besideHalf(__m128i first, __m128i second, __m256d q) const {
        const __m256i y = _mm256_cvtepi32_epi64(first), x = _mm256_cvtepi32_epi64(second);
        const __m256i minus = _mm256_setr_epi64x(0, -1, 0, -1), one = _mm256_set1_epi64x(1);
        const __m256i byReal = _mm256_mul_epi32(x, _mm256_shuffle_epi32(y, 0x44));  // ca, da
        const __m256i byImaginary = _mm256_mul_epi32(_mm256_shuffle_epi32(x, 0x4E), _mm256_shuffle_epi32(y, 0xEE));
        const __m256i sum = _mm256_add_epi64(byReal, _mm256_sub_epi64(_mm256_xor_si256(byImaginary, minus), minus));
        const __m256i squares = _mm256_mul_epi32(y, y),
                      norm = _mm256_add_epi64(squares, _mm256_shuffle_epi32(squares, 0x4E));
        const __m256d below = _mm256_floor_pd(q), shift = _mm256_set1_pd(0x1.8p52);
        const __m256i k =
            _mm256_sub_epi64(_mm256_castpd_si256(_mm256_add_pd(below, shift)), _mm256_castpd_si256(shift));
        const __m256i odd = _mm256_add_epi64(_mm256_add_epi64(k, k), one);
        // A shift by 64 or more gives 0, which is right modulo 2^64.
        const __m256i twice = _mm256_sll_epi64(sum, _mm_cvtsi32_si128(1 - std::clamp(scale, -100, 0)));
        const __m256i half = _mm256_sll_epi64(product(odd, norm), _mm_cvtsi32_si128(std::clamp(scale, 0, 100)));
        const __m256i d = _mm256_sub_epi64(twice, half), zero = _mm256_setzero_si256();
        // One more where D > 0, and where D = 0 for an odd k.
        const __m256i isOdd = _mm256_cmpeq_epi64(_mm256_and_si256(k, one), one);
        const __m256i up =
            _mm256_or_si256(_mm256_cmpgt_epi64(d, zero), _mm256_and_si256(_mm256_cmpeq_epi64(d, zero), isOdd));
        return _mm256_add_pd(below, _mm256_and_pd(_mm256_castsi256_pd(up), _mm256_set1_pd(1)));
    }
    /// Modulo 2^64.
    static QORI_INLINE __m256i product(__m256i a, __m256i b) {
        const __m256i crossed = _mm256_mullo_epi32(a, _mm256_shuffle_epi32(b, 0xB1));
        const __m256i high = _mm256_add_epi32(_mm256_slli_epi64(crossed, 32), crossed);
        const __m256i top = _mm256_and_si256(high, _mm256_set1_epi64x(static_cast<int64_t>(0xFFFFFFFF00000000u)));
        return _mm256_add_epi64(_mm256_mul_epu32(a, b), top);
    }
    QORI_NOINLINE Vec<QorComplex32s> exactly(Vec<QorComplex32s> first, Vec<QorComplex32s> second) const {
        QorComplex32s y[4], x[4];
        store(y, first);
        store(x, second);
        for (int i = 0; i < 4; ++i) x[i] = divideExactly(y[i], x[i], scale);
        return load(x);
    }
    int32_t scale;
    double factor;
};

// --- floats ---------------------------------------------------------------------------------------------------------

/// What a zero divisor makes of a numerator: the NaN 0x7FBFFFFF (signalling) of 0 and NaN, else an infinity with the
/// sign of both.
QORI_INLINE __m256 overZero(__m256 numerator, __m256 divisor) {
    const __m256 sign = _mm256_and_ps(_mm256_set1_ps(-0.f), _mm256_xor_ps(numerator, divisor));
    const __m256 infinite = _mm256_or_ps(sign, _mm256_castsi256_ps(_mm256_set1_epi32(0x7F800000)));
    const __m256 undefined = _mm256_cmp_ps(numerator, _mm256_setzero_ps(), _CMP_EQ_UQ);
    return _mm256_blendv_ps(infinite, _mm256_castsi256_ps(_mm256_set1_epi32(0x7FBFFFFF)), undefined);
}

/// With r the processor's approximate reciprocal of d and e = 1 - d r: n r (1 + e + e^2). Not the correctly rounded
/// quotient, and it may differ between makes of processors with their reciprocals.
struct DivideFloats {
    explicit DivideFloats(int32_t) {}

    static QORI_INLINE __m256i zeroDivisors(Vec<float> first) {
        return _mm256_castps_si256(_mm256_cmp_ps(first.v, _mm256_setzero_ps(), _CMP_EQ_OQ));
    }
    QORI_INLINE Vec<float> operator()(Vec<float> first, Vec<float> second) const {
        const __m256 none = _mm256_castsi256_ps(zeroDivisors(first)), one = _mm256_set1_ps(1);
        const __m256 d = _mm256_blendv_ps(first.v, one, none);
        const __m256 r = _mm256_rcp_ps(d);
        const __m256 e = _mm256_fnmadd_ps(d, r, one);
        const __m256 q = _mm256_mul_ps(second.v, r);
        const __m256 result = _mm256_fmadd_ps(_mm256_fmadd_ps(q, e, q), e, q);
        if (_mm256_testz_ps(none, none)) return {result};
        return {_mm256_blendv_ps(result, overZero(second.v, first.v), none)};
    }
};

/// In double precision, where squares neither overflow nor vanish, rounded to float at the end.
struct DivideComplexFloats {
    explicit DivideComplexFloats(int32_t) {}

    static QORI_INLINE __m256i zeroDivisors(Vec<QorComplex32f> first) {
        const __m256 none = _mm256_cmp_ps(components(first).v, _mm256_setzero_ps(), _CMP_EQ_OQ);
        return _mm256_castps_si256(_mm256_and_ps(none, _mm256_permute_ps(none, 0xB1)));
    }
    QORI_INLINE Vec<QorComplex32f> operator()(Vec<QorComplex32f> first, Vec<QorComplex32f> second) const {
        const __m256 y = components(first).v, x = components(second).v;
        const __m256 none = _mm256_castsi256_ps(zeroDivisors(first));
        const __m256 d = _mm256_blendv_ps(y, _mm256_set1_ps(1), none);
        const __m128 low = quotients(_mm256_castps256_ps128(x), _mm256_castps256_ps128(d));
        const __m256 result = _mm256_set_m128(quotients(_mm256_extractf128_ps(x, 1), _mm256_extractf128_ps(d, 1)), low);
        return elements<QorComplex32f>({_mm256_blendv_ps(result, overZero(x, _mm256_setzero_ps()), none)});
    }

private:
    static QORI_INLINE __m128 quotients(__m128 numerators, __m128 divisors) {
        const __m256d x = _mm256_cvtps_pd(numerators), y = _mm256_cvtps_pd(divisors);
        const __m256d squares = _mm256_mul_pd(y, y), norm = _mm256_add_pd(squares, _mm256_permute_pd(squares, 0x5));
        const __m256d byReal = _mm256_mul_pd(x, _mm256_movedup_pd(y));                                    // ca, da
        const __m256d byImaginary = _mm256_mul_pd(_mm256_permute_pd(x, 0x5), _mm256_permute_pd(y, 0xF));  // db, cb
        const __m256d sums = _mm256_addsub_pd(byReal, _mm256_xor_pd(byImaginary, _mm256_set1_pd(-0.)));
        return _mm256_cvtpd_ps(_mm256_div_pd(sums, norm));
    }
};

// --- row operations -------------------------------------------------------------------------------------------------

/// second / first, remembering zero divisors.
template <class T, class Divide>
struct Division {
    static constexpr bool mayStream = true;
    Divide divide;
    ZeroDivisors zeros;

    using Block = Pack<T, Vec<T>::lanes>;
    QORI_INLINE Block operator()(int, Block first, Block second) {
        zeros.note(Divide::zeroDivisors(first.v[0]));
        return {{divide(first.v[0], second.v[0])}};
    }
    QORI_INLINE Block tail(int, ptrdiff_t count, Block first, Block second) {
        zeros.noteFirst<T>(Divide::zeroDivisors(first.v[0]), count);
        return {{divide(first.v[0], second.v[0])}};
    }
};

/// second / first with a constant divisor per channel, none of them zero.
template <class T, class Divide>
struct DivisionByConstants {
    static constexpr bool mayStream = true;
    Divide divide;
    typename Divide::Prepared divisors[3];

    DivisionByConstants(Divide division, const ChannelVectors<T>& values)
        : divide(division),
          divisors{divide.prepare(values.v[0]), divide.prepare(values.v[1]), divide.prepare(values.v[2])} {}

    QORI_INLINE Pack<T, Vec<T>::lanes> operator()(int phase, Pack<T, Vec<T>::lanes> numerators) {
        return {{divide.apply(divisors[phase], numerators.v[0])}};
    }
};

/// Calls use(divide) with the division of elements T.
template <class T, class Use>
void withDivision(int32_t scale, Use use) {
    if constexpr (std::is_same_v<T, QorComplex16s>)
        use(DivideComplex16{scale});
    else if constexpr (std::is_same_v<T, QorComplex32s>)
        use(DivideComplex32{scale});
    else if constexpr (std::is_same_v<T, QorComplex32f>)
        use(DivideComplexFloats{scale});
    else if constexpr (std::is_same_v<T, float>)
        use(DivideFloats{scale});
    else
        withRoundedDivision<T, roundNearestEven>(scale, use);
}

}  // namespace qori::kernels
