// SPDX-License-Identifier: Apache-2.0
// Exponential and logarithm of vectors. The float forms stay within 1 ulp of the rounded result (checked over all
// floats), the double forms within 1e-14 relative, which decides every rounding of an integer result. They want the
// default control register.
#pragma once
#include <cmath>

#include "kernels/simd.h"

namespace qori::kernels {

namespace detail {

/// c[0] + c[1] x + c[2] x^2 + ..., by Horner's rule in fused steps.
template <size_t n>
QORI_INLINE __m256 polynomial(__m256 x, const float (&c)[n]) {
    __m256 sum = _mm256_set1_ps(c[n - 1]);
    for (size_t i = n - 1; i-- > 0;) sum = _mm256_fmadd_ps(sum, x, _mm256_set1_ps(c[i]));
    return sum;
}

template <size_t n>
QORI_INLINE __m256d polynomial(__m256d x, const double (&c)[n]) {
    __m256d sum = _mm256_set1_pd(c[n - 1]);
    for (size_t i = n - 1; i-- > 0;) sum = _mm256_fmadd_pd(sum, x, _mm256_set1_pd(c[i]));
    return sum;
}

/// 2^n for -126 <= n <= 127.
QORI_INLINE __m256 powerOfTwo(__m256i n) {
    return _mm256_castsi256_ps(_mm256_slli_epi32(_mm256_add_epi32(n, _mm256_set1_epi32(127)), 23));
}

// ln 2 in two parts: the first has zeros in its low bits, so that its products with exponents are exact.
inline constexpr float kLn2High = 0.693145751953125f, kLn2Low = 1.42860682030941723212e-6f;

}  // namespace detail

/// x = n ln 2 + r with |r| <= ln 2 / 2; e^r by its Taylor series to the 7th power (the rest is below 2^-28), 2^n in two
/// factors so that subnormal results are rounded once.
QORI_INLINE __m256 exponential(__m256 x) {
    // Beyond these the result is infinite or 0 whatever x is; NaNs pass.
    const __m256 bounded = _mm256_max_ps(_mm256_set1_ps(-104.0f), _mm256_min_ps(_mm256_set1_ps(89.0f), x));
    const __m256 n = _mm256_round_ps(_mm256_mul_ps(bounded, _mm256_set1_ps(1.44269504f)),
                                     _MM_FROUND_TO_NEAREST_INT | _MM_FROUND_NO_EXC);
    __m256 r = _mm256_fnmadd_ps(n, _mm256_set1_ps(detail::kLn2High), bounded);
    r = _mm256_fnmadd_ps(n, _mm256_set1_ps(detail::kLn2Low), r);
    static constexpr float c[] = {1.0f, 1.0f, 1.0f / 2, 1.0f / 6, 1.0f / 24, 1.0f / 120, 1.0f / 720, 1.0f / 5040};
    const __m256 power = detail::polynomial(r, c);
    const __m256i whole = _mm256_cvtps_epi32(n), half = _mm256_srai_epi32(whole, 1);
    const __m256 scaled = _mm256_mul_ps(power, detail::powerOfTwo(half));
    return _mm256_mul_ps(scaled, detail::powerOfTwo(_mm256_sub_epi32(whole, half)));
}

namespace detail {

/// ln(x 2^-scaling) of positive normal floats. x = 2^e m with sqrt(1/2) <= m < sqrt(2); ln m = f - f^2/2 + f^3 P(f),
/// f = m - 1, with the minimax polynomial P of the Cephes library (Moshier, logf: relative error 2^-27).
QORI_INLINE __m256 logarithmOfNormal(__m256 x, __m256 scaling) {
    // Without the bits of sqrt(1/2) the exponent field changes at it.
    const __m256i rootHalf = _mm256_set1_epi32(0x3F3504F3), bits = _mm256_castps_si256(x);
    const __m256i above = _mm256_sub_epi32(bits, rootHalf);
    const __m256i power = _mm256_and_si256(above, _mm256_set1_epi32(static_cast<int32_t>(0xFF800000u)));
    const __m256 f = _mm256_sub_ps(_mm256_castsi256_ps(_mm256_sub_epi32(bits, power)), _mm256_set1_ps(1.0f));
    const __m256 e = _mm256_sub_ps(_mm256_cvtepi32_ps(_mm256_srai_epi32(above, 23)), scaling);
    static constexpr float c[] = {3.3333331174E-1f,  -2.4999993993E-1f, 2.0000714765E-1f,
                                  -1.6668057665E-1f, 1.4249322787E-1f,  -1.2420140846E-1f,
                                  1.1676998740E-1f,  -1.1514610310E-1f, 7.0376836292E-2f};
    const __m256 square = _mm256_mul_ps(f, f);
    __m256 rest = _mm256_mul_ps(_mm256_mul_ps(f, square), polynomial(f, c));
    rest = _mm256_fmadd_ps(e, _mm256_set1_ps(kLn2Low), rest);
    rest = _mm256_fnmadd_ps(square, _mm256_set1_ps(0.5f), rest);
    return _mm256_fmadd_ps(e, _mm256_set1_ps(kLn2High), _mm256_add_ps(f, rest));
}

/// Subnormals are scaled by 2^25. 0: minus infinity; negative or NaN: a NaN; infinity stays.
inline __m256 logarithmOfAny(__m256 x) {
    const __m256 tiny = _mm256_cmp_ps(x, _mm256_set1_ps(1.17549435e-38f), _CMP_LT_OQ);
    const __m256 normal = _mm256_blendv_ps(x, _mm256_mul_ps(x, _mm256_set1_ps(33554432.0f)), tiny);
    __m256 result = logarithmOfNormal(normal, _mm256_and_ps(tiny, _mm256_set1_ps(25.0f)));
    const __m256 infinity = _mm256_set1_ps(INFINITY);
    result = _mm256_blendv_ps(result, _mm256_set1_ps(-INFINITY), _mm256_cmp_ps(x, _mm256_setzero_ps(), _CMP_EQ_OQ));
    result = _mm256_blendv_ps(result, infinity, _mm256_cmp_ps(x, infinity, _CMP_EQ_OQ));
    return _mm256_or_ps(result, _mm256_cmp_ps(x, _mm256_setzero_ps(), _CMP_NGE_UQ));
}

}  // namespace detail

QORI_INLINE __m256 logarithm(__m256 x) {
    // Positive and normal: the bits above those of the least, as unsigned numbers, reach not up to infinity.
    const __m256i above = _mm256_sub_epi32(_mm256_castps_si256(x), _mm256_set1_epi32(0x00800000));
    const __m256i special = _mm256_cmpeq_epi32(_mm256_max_epu32(above, _mm256_set1_epi32(0x7F000000)), above);
    if (!_mm256_testz_si256(special, special)) [[unlikely]]
        return detail::logarithmOfAny(x);
    return detail::logarithmOfNormal(x, _mm256_setzero_ps());
}

/// ln of integers from 1 to 65,535: x = 2^e m as above, ln m = 2 (t + t^3/3 + ...), t = (m - 1) / (m + 1), |t| < 0.172;
/// the series to t^21 leaves less than 1e-18.
QORI_INLINE __m256d logarithm(__m128i x) {
    const __m256d value = _mm256_cvtepi32_pd(x);
    constexpr int64_t kOne = 0x3FF0000000000000, kRootHalf = 0x3FE6A09E667F3BCC;
    const __m256i bits = _mm256_add_epi64(_mm256_castpd_si256(value), _mm256_set1_epi64x(kOne - kRootHalf));
    const __m256i mantissa =
        _mm256_add_epi64(_mm256_and_si256(bits, _mm256_set1_epi64x(0x000FFFFFFFFFFFFF)), _mm256_set1_epi64x(kRootHalf));
    // The exponent field sits in the high words.
    const __m256i high =
        _mm256_permutevar8x32_epi32(_mm256_srli_epi64(bits, 52), _mm256_setr_epi32(0, 2, 4, 6, 0, 2, 4, 6));
    const __m256d e = _mm256_cvtepi32_pd(_mm_sub_epi32(_mm256_castsi256_si128(high), _mm_set1_epi32(1023)));
    const __m256d m = _mm256_castsi256_pd(mantissa), one = _mm256_set1_pd(1.0);
    const __m256d t = _mm256_div_pd(_mm256_sub_pd(m, one), _mm256_add_pd(m, one));
    static constexpr double c[] = {2.0,      2.0 / 3,  2.0 / 5,  2.0 / 7,  2.0 / 9, 2.0 / 11,
                                   2.0 / 13, 2.0 / 15, 2.0 / 17, 2.0 / 19, 2.0 / 21};
    const __m256d series = _mm256_mul_pd(t, detail::polynomial(_mm256_mul_pd(t, t), c));
    return _mm256_fmadd_pd(e, _mm256_set1_pd(0.693147180559945309417), series);
}

/// e^x * 2^-scale rounded to nearest and saturated to `most`, for all integers x: 0 below a run of at most 14 values,
/// which stand in the table, `most` above it, as e^13 exceeds twice 65,536.
struct ExponentialTable {
    static constexpr int kSize = 16;
    alignas(kVectorBytes) int32_t value[kSize];  ///< For x = first - 1 (and less), first, ..., first + 14 (and more).
    int32_t first;

    ExponentialTable(int32_t scale, int32_t most) {
        constexpr double kLn2 = 0.693147180559945309417;
        // A result of 1 needs e^x > 2^(scale - 1). Beyond +-2^17 no 16-bit x is in the run.
        const int32_t bounded = scale > 200'000 ? 200'000 : scale < -200'000 ? -200'000 : scale;
        first = static_cast<int32_t>((bounded - 1) * kLn2) - 1;
        value[0] = 0;
        value[kSize - 1] = most;
        for (int i = 1; i < kSize - 1; ++i) value[i] = rounded(first + i - 1, bounded, most);
    }

private:
    /// log2 e in two parts, the first of 30 bits, so that its product with x (up to 18 bits) is exact.
    static int32_t rounded(int32_t x, int32_t scale, int32_t most) {
        constexpr double kHigh = 1.4426950402557850, kLow = 1.4426950408889634074 - kHigh;
        constexpr double kLowRest = 2.0355273740931033e-17;  // log2 e beyond the double
        const double high = x * kHigh, low = x * kLow + x * kLowRest;
        const int32_t whole = static_cast<int32_t>(high + low + (high + low < 0 ? -0.5 : 0.5));
        const int32_t exponent = whole - scale;
        if (exponent > 20) return most;
        if (exponent < -4) return 0;
        const double z = ((high - whole) + low) * 0.693147180559945309417;  // |z| < 0.35
        double sum = 1.0, term = 1.0;
        for (int i = 1; i <= 14; ++i) sum += term *= z / i;
        const double result = exponent < 0 ? sum / (1 << -exponent) : sum * (1 << exponent);
        if (result >= most) return most;
        const auto below = static_cast<int32_t>(result);
        const double rest = result - below;
        return below + (rest > 0.5 || (rest == 0.5 && below % 2 == 1));
    }
};

}  // namespace qori::kernels
