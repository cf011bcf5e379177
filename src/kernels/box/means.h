// SPDX-License-Identifier: Apache-2.0
// From the sum of a window to the mean that is stored. A rule takes the sums of one vector of elements, in order.
#pragma once
#include "kernels/box/columns.h"

namespace qori::kernels {

/// Vectors of sums for one of elements.
template <class S, class T>
inline constexpr int kSumVectors = static_cast<int>(sizeof(S) / sizeof(T));

namespace detail {

/// 2^23 in the exponent of a float, whose lower bits then count units.
inline constexpr uint16_t kUnitsBits = 0x4B00;
inline constexpr float kUnits = 8388608;

/// Four vectors of 0 to 255, each in order.
QORI_INLINE Bytes packBytes(const __m256i* v) {
    const __m256i packed = _mm256_packus_epi16(_mm256_packs_epi32(v[0], v[1]), _mm256_packs_epi32(v[2], v[3]));
    return {_mm256_permutevar8x32_epi32(packed, _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7))};
}

}  // namespace detail

/// Exact division of byte sums by 9, 25 or 49, to nearest; there are no ties, these being odd.
///
/// With S = area * q + r, |r| <= (area - 1) / 2:
///   9   S <= 2,295: (S * 3641 + 2^14) >> 15. 3641 / 2^15 exceeds 1/9 by 3.4e-6; times 2,295 that is 0.008, and r / 9
///       stays 1/18 = 0.056 from the half.
///   25  S <= 6,375: floor((S + 12) / 25) = (S + 12) * 5243 >> 17. 5243 / 2^17 exceeds 1/25 by 9.2e-7; times 6,387 that
///       is 0.006 < 1/25.
///   49  S <= 12,495: floor((S + 24) / 49) = (S + 24) * 21400 >> 20. 21400 / 2^20 exceeds 1/49 by 4.7e-7; times 12,519
///       that is 0.006 < 1/49.
template <int area>
struct ExactMean {
    QORI_INLINE static Vec<uint16_t> mean(Vec<uint16_t> s) {
        if constexpr (area == 9)
            return {_mm256_mulhrs_epi16(s.v, _mm256_set1_epi16(3641))};
        else if constexpr (area == 25)
            return divided<5243, 1>(s + splat<uint16_t>(12));
        else
            return divided<21400, 4>(s + splat<uint16_t>(24));
    }
    QORI_INLINE Bytes operator()(const Vec<uint16_t>* s, ptrdiff_t, ptrdiff_t) const {
        return {narrowSaturated<uint8_t>(Vec<int16_t>{mean(s[0]).v}, Vec<int16_t>{mean(s[1]).v}).v};
    }

private:
    template <int factor, int shift>
    QORI_INLINE static Vec<uint16_t> divided(Vec<uint16_t> s) {
        return {_mm256_srli_epi16(_mm256_mulhi_epu16(s.v, _mm256_set1_epi16(factor)), shift)};
    }
};

/// The largest area whose sums of bytes the units of 2^23 hold.
inline constexpr int64_t kMostInUnits = (1 << 23) / 255;

/// Bytes: the sum as a float times the float reciprocal of the area, to nearest, ties to even. For odd areas below
/// 8,000 this is the exact quotient's rounding: the product is off by less than 255 * 2^-23 = 3.1e-5 and the quotient
/// stays 1 / (2 area) from the half.
struct FloatMean {
    float reciprocal;

    explicit FloatMean(int64_t area) : reciprocal(1.0f / static_cast<float>(area)) {}

    /// A float of value 2^23 + s minus 2^23, times the reciprocal, is one rounding of the exact product.
    QORI_INLINE __m256i meanOfUnits(__m256i units) const {
        const __m256 r = _mm256_set1_ps(reciprocal), below = _mm256_set1_ps(-detail::kUnits * reciprocal);
        return _mm256_cvtps_epi32(_mm256_fmadd_ps(_mm256_castsi256_ps(units), r, below));
    }
    /// s < 2^31, rounded to a float first where it is 2^24 or more.
    QORI_INLINE __m256i mean(Vec<uint32_t> s) const {
        return _mm256_cvtps_epi32(_mm256_mul_ps(_mm256_cvtepi32_ps(s.v), _mm256_set1_ps(reciprocal)));
    }
    QORI_INLINE Bytes operator()(const Vec<uint16_t>* s, ptrdiff_t, ptrdiff_t) const {
        const __m256i exponent = _mm256_set1_epi16(detail::kUnitsBits);
        __m256i packed[2];
        for (int k = 0; k < 2; ++k)
            packed[k] = _mm256_packs_epi32(meanOfUnits(_mm256_unpacklo_epi16(s[k].v, exponent)),
                                           meanOfUnits(_mm256_unpackhi_epi16(s[k].v, exponent)));
        return {narrowSaturated<uint8_t>(Vec<int16_t>{packed[0]}, Vec<int16_t>{packed[1]}).v};
    }
    QORI_INLINE Bytes operator()(const Vec<uint32_t>* s, ptrdiff_t, ptrdiff_t) const {
        const __m256i means[] = {mean(s[0]), mean(s[1]), mean(s[2]), mean(s[3])};
        return detail::packBytes(means);
    }
    QORI_INLINE Bytes operator()(const Vec<double>* s, ptrdiff_t, ptrdiff_t) const {
        __m256i means[4];
        for (int k = 0; k < 4; ++k) {
            const __m256 sums = _mm256_set_m128(_mm256_cvtpd_ps(s[2 * k + 1].v), _mm256_cvtpd_ps(s[2 * k].v));
            means[k] = _mm256_cvtps_epi32(_mm256_mul_ps(sums, _mm256_set1_ps(reciprocal)));
        }
        return detail::packBytes(means);
    }
};

/// 16 bits: the exact quotient to nearest, ties to even; int16_t by sums that have 2^15 too much per element.
template <class T>
struct WordMean {
    double area, reciprocal;

    explicit WordMean(int64_t size) : area(static_cast<double>(size)), reciprocal(1 / area) {}

    /// s < 2^32, area <= 65,537. The product is off by 2^-35 at most and the quotient of what is no tie stays
    /// 1 / (2 area) > 2^-18 from the half: rounded to multiples of 2^-20 first, only ties come to lie on the half. The
    /// second sum, 2^52 more, rounds to even integers.
    QORI_INLINE __m256i mean(Vec<uint32_t> s) const {
        const __m256i exponent = _mm256_set1_epi32(0x43300000);  // a double of 2^52, whose low bits count units
        const __m256d units = _mm256_set1_pd(0x1p52), r = _mm256_set1_pd(reciprocal);
        const auto half = [&](__m256i bits) __attribute__((always_inline)) {
            const __m256d sum = _mm256_sub_pd(_mm256_castsi256_pd(bits), units);
            const __m256d fine = _mm256_fmadd_pd(sum, r, _mm256_set1_pd(0x1p32));
            return _mm256_castpd_ps(_mm256_add_pd(fine, _mm256_set1_pd(0x1p52 - 0x1p32)));
        };
        const __m256 low = half(_mm256_unpacklo_epi32(s.v, exponent)),
                     high = half(_mm256_unpackhi_epi32(s.v, exponent));
        return _mm256_castps_si256(_mm256_shuffle_ps(low, high, 0x88));
    }
    /// Sums of doubles are integers below 2^53, whose quotients are rounded once: what is no tie stays 2^-37 from the
    /// half for any area below 2^36.
    QORI_INLINE __m256i mean(const Vec<double>* s) const {
        const __m256d divisor = _mm256_set1_pd(area);
        return _mm256_set_m128i(_mm256_cvtpd_epi32(_mm256_div_pd(s[1].v, divisor)),
                                _mm256_cvtpd_epi32(_mm256_div_pd(s[0].v, divisor)));
    }
    QORI_INLINE static Vec<T> packed(__m256i low, __m256i high) {
        const __m256i words = _mm256_permute4x64_epi64(_mm256_packus_epi32(low, high), 0xD8);
        return {std::is_signed_v<T> ? _mm256_xor_si256(words, _mm256_set1_epi16(-32768)) : words};
    }
    QORI_INLINE Vec<T> operator()(const Vec<uint32_t>* s, ptrdiff_t, ptrdiff_t) const {
        return packed(mean(s[0]), mean(s[1]));
    }
    QORI_INLINE Vec<T> operator()(const Vec<double>* s, ptrdiff_t, ptrdiff_t) const {
        return packed(mean(s), mean(s + 2));
    }
};

/// The sum divided by the area in the elements' own precision.
template <class T>
struct Quotient {
    T area;

    explicit Quotient(int64_t size) : area(static_cast<T>(size)) {}

    QORI_INLINE Vec<T> operator()(const Vec<T>* s, ptrdiff_t, ptrdiff_t) const {
        if constexpr (std::is_same_v<T, float>)
            return {_mm256_div_ps(s->v, _mm256_set1_ps(area))};
        else
            return {_mm256_div_pd(s->v, _mm256_set1_pd(area))};
    }
};

/// The sum itself.
struct PlainSum {
    QORI_INLINE Vec<uint32_t> operator()(const Vec<uint32_t>* s, ptrdiff_t, ptrdiff_t) const { return *s; }
};

/// The sum as a float, rounded once; of int16_t, less the 2^15 per element that it has too much.
struct FloatSum {
    int64_t excess;

    QORI_INLINE Vec<float> operator()(const Vec<uint32_t>* s, ptrdiff_t, ptrdiff_t) const {
        const __m256i exponent = _mm256_set1_epi32(0x43300000);
        const __m256d base = _mm256_set1_pd(0x1p52 + static_cast<double>(excess));
        const __m256i low = _mm256_cvtepu32_epi64(_mm256_castsi256_si128(s->v));
        const __m256i high = _mm256_cvtepu32_epi64(_mm256_extracti128_si256(s->v, 1));
        const __m256i up = _mm256_slli_epi64(exponent, 32);
        const auto half = [&](__m256i sums) __attribute__((always_inline)) {
            return _mm256_cvtpd_ps(_mm256_sub_pd(_mm256_castsi256_pd(_mm256_or_si256(sums, up)), base));
        };
        return {_mm256_set_m128(half(high), half(low))};
    }
    QORI_INLINE Vec<float> operator()(const Vec<double>* s, ptrdiff_t, ptrdiff_t) const {
        const __m256d less = _mm256_set1_pd(static_cast<double>(excess));
        return {_mm256_set_m128(_mm256_cvtpd_ps(_mm256_sub_pd(s[1].v, less)),
                                _mm256_cvtpd_ps(_mm256_sub_pd(s[0].v, less)))};
    }
};

}  // namespace qori::kernels
