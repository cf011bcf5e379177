// SPDX-License-Identifier: Apache-2.0
// Straight lines and cubics between levels, in double precision: evaluated for every value of an integer type, or for
// the elements of a block. Both evaluate the same chain of fused operations.
#pragma once
#include <algorithm>
#include <cmath>

#include "table_rows.h"

namespace qori::kernels {

/// One channel's nodes and its polynomials: interval k maps v to value[a] + d * (c1 + d * (c2 + d * c3)) with
/// d = v - level[a]. Straight lines start at their own node, a = k, and have no c2 and c3.
template <class L>
struct Curve {
    const L* levels;
    const L* values;
    int32_t count;
    double* c[3];  ///< One of each per interval; straight lines: c[0] only.
    bool isCubic;

    int32_t anchor(int32_t k) const { return isCubic ? std::clamp(k - 1, 0, count - 4) + 1 : k; }
};

struct Polynomial {
    double c[3];
};

/// Floats: both differences are rounded to single precision, and the quotient is not.
template <class L>
Polynomial straightLine(const Curve<L>& curve, int32_t k) {
    if constexpr (std::is_floating_point_v<L>) {
        const float rise = curve.values[k + 1] - curve.values[k], run = curve.levels[k + 1] - curve.levels[k];
        return {{double{rise} / double{run}, 0, 0}};
    } else {
        const double rise = double(curve.values[k + 1]) - double(curve.values[k]);
        return {{rise / (double(curve.levels[k + 1]) - double(curve.levels[k])), 0, 0}};
    }
}

/// The cubic through nodes a - 1 to a + 2 by Cramer's rule on their differences d and y from node a. The determinants
/// have six factors of up to 2^129 each, or up to seven: no product leaves the range of double precision, and none of
/// the smallest differences, 2^-149, vanishes. Where levels of the four nodes coincide there is no such cubic: then
/// the parabola through node a and the ends of the interval, or the straight line where node a is one of the ends.
template <class L>
Polynomial cubic(const Curve<L>& curve, int32_t k) {
    const int32_t a = curve.anchor(k);
    const auto d = [&](int32_t node) { return double(curve.levels[node]) - double(curve.levels[a]); };
    const auto y = [&](int32_t node) { return double(curve.values[node]) - double(curve.values[a]); };
    const double d1 = d(a - 1), d2 = d(a + 1), d3 = d(a + 2), y1 = y(a - 1), y2 = y(a + 1), y3 = y(a + 2);
    const double d21 = d2 - d1, d31 = d3 - d1, d32 = d3 - d2, all = d1 * d2 * d3 * d21 * d31 * d32;
    if (all != 0) {
        const double m1 = d2 * d3 * d32, m2 = d1 * d3 * d31, m3 = d1 * d2 * d21;
        return {{(y1 * m1 * (d2 * d3) - y2 * m2 * (d1 * d3) + y3 * m3 * (d1 * d2)) / all,
                 (y2 * m2 * (d3 + d1) - y1 * m1 * (d3 + d2) - y3 * m3 * (d2 + d1)) / all,
                 (y1 * m1 - y2 * m2 + y3 * m3) / all}};
    }
    const double e1 = d(k), e2 = d(k + 1), z1 = y(k), z2 = y(k + 1), both = e1 * e2 * (e2 - e1);
    if (both != 0) return {{(z1 * e2 * e2 - z2 * e1 * e1) / both, (e1 * z2 - e2 * z1) / both, 0}};
    return {{e2 != 0 ? z2 / e2 : z1 / e1, 0, 0}};
}

template <class L>
Polynomial polynomial(const Curve<L>& curve, int32_t k) {
    return curve.isCubic ? cubic(curve, k) : straightLine(curve, k);
}

/// Fills curve.c for the intervals whose levels rise; the others hold no element.
template <class L>
void fillPolynomials(const Curve<L>& curve) {
    for (int32_t k = 0; k < curve.count - 1; ++k) {
        const Polynomial p = curve.levels[k] < curve.levels[k + 1] ? polynomial(curve, k) : Polynomial{};
        for (int i = 0; i < (curve.isCubic ? 3 : 1); ++i) curve.c[i][k] = p.c[i];
    }
}

namespace detail {

QORI_INLINE __m256d evaluateLine(__m256d d, __m256d base, __m256d c1) { return _mm256_fmadd_pd(d, c1, base); }
QORI_INLINE __m256d evaluateCubic(__m256d d, __m256d base, __m256d c1, __m256d c2, __m256d c3) {
    return _mm256_fmadd_pd(d, _mm256_fmadd_pd(d, _mm256_fmadd_pd(d, c3, c2), c1), base);
}

/// Truncated, to be saturated when it is stored: too large ones as T's highest, as they have no conversion; too small
/// ones convert to the lowest word. Cubics are rounded by adding a half.
template <class T, bool isCubic>
QORI_INLINE __m128i toWords(__m256d r) {
    if constexpr (isCubic) r = _mm256_add_pd(r, _mm256_set1_pd(0.5));
    return _mm256_cvttpd_epi32(_mm256_min_pd(r, _mm256_set1_pd(kHighestOf<T>)));
}

/// Four and eight words, saturated to T.
QORI_INLINE void storeFour(uint16_t* p, __m128i a) {
    _mm_storel_epi64(reinterpret_cast<__m128i*>(p), _mm_packus_epi32(a, a));
}
QORI_INLINE void storeFour(int16_t* p, __m128i a) {
    _mm_storel_epi64(reinterpret_cast<__m128i*>(p), _mm_packs_epi32(a, a));
}
QORI_INLINE void storeEight(uint16_t* p, __m128i a, __m128i b) {
    _mm_storeu_si128(reinterpret_cast<__m128i*>(p), _mm_packus_epi32(a, b));
}
QORI_INLINE void storeEight(int16_t* p, __m128i a, __m128i b) {
    _mm_storeu_si128(reinterpret_cast<__m128i*>(p), _mm_packs_epi32(a, b));
}
QORI_INLINE void storeEight(uint8_t* p, __m128i a, __m128i b) {
    const __m128i words = _mm_packs_epi32(a, b);
    _mm_storel_epi64(reinterpret_cast<__m128i*>(p), _mm_packus_epi16(words, words));
}

}  // namespace detail

/// table[v] for first <= v < end, by the polynomial of interval k.
template <class T, bool isCubic>
QORI_NOINLINE void tabulate(T* table, int32_t first, int32_t end, const Curve<int32_t>& curve, int32_t k) {
    const Polynomial p = polynomial(curve, k);
    const int32_t a = curve.anchor(k);
    const __m256d base = _mm256_set1_pd(curve.values[a]), origin = _mm256_set1_pd(curve.levels[a]);
    const __m256d c1 = _mm256_set1_pd(p.c[0]), c2 = _mm256_set1_pd(p.c[1]), c3 = _mm256_set1_pd(p.c[2]);
    const auto four = [&](int32_t v) {
        const __m128i at = _mm_add_epi32(_mm_set1_epi32(v), _mm_setr_epi32(0, 1, 2, 3));
        const __m256d d = _mm256_sub_pd(_mm256_cvtepi32_pd(at), origin);
        return detail::toWords<T, isCubic>(isCubic ? detail::evaluateCubic(d, base, c1, c2, c3)
                                                   : detail::evaluateLine(d, base, c1));
    };
    int32_t v = first;
    for (; v <= end - 8; v += 8) detail::storeEight(table + v, four(v), four(v + 4));
    if (v == end) return;
    T last[8];
    detail::storeEight(last, four(v), four(v + 4));
    for (int i = 0; v < end; ++i, ++v) table[v] = last[i];
}

namespace detail {

QORI_INLINE __m256d fourAt(const float* p, __m128i at) { return _mm256_cvtps_pd(_mm_i32gather_ps(p, at, 4)); }
QORI_INLINE __m256d fourAt(const int32_t* p, __m128i at) { return _mm256_cvtepi32_pd(_mm_i32gather_epi32(p, at, 4)); }
QORI_INLINE __m256d fourAt(const double* p, __m128i at) {
    const __m256d all = _mm256_castsi256_pd(_mm256_set1_epi32(-1));
    return _mm256_mask_i32gather_pd(_mm256_setzero_pd(), p, at, all, 8);  // the plain one is warned of: undefined
}

QORI_INLINE __m128i fourWords(const float* p) { return _mm_loadu_si128(reinterpret_cast<const __m128i*>(p)); }
QORI_INLINE __m128i fourWords(const uint16_t* p) {
    return _mm_cvtepu16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(p)));
}
QORI_INLINE __m128i fourWords(const int16_t* p) {
    return _mm_cvtepi16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(p)));
}

}  // namespace detail

/// Where curve.c has the polynomial of element x: at its interval, or at x.
enum class Solved { byInterval, byElement };

/// A block in place, element x by the polynomial of interval places[x] - 1 where there is one.
template <bool isCubic, Solved solved = Solved::byInterval, class T, class L>
QORI_NOINLINE void mapByCurve(T* block, int n, const uint32_t* places, const Curve<L>& curve) {
    const __m128i one = _mm_set1_epi32(1), lastInterval = _mm_set1_epi32(curve.count - 2);
    for (int x = 0; x < n; x += 4) {
        const __m128i place = _mm_loadu_si128(reinterpret_cast<const __m128i*>(places + x));
        const __m128i wanted = _mm_sub_epi32(place, one), k = _mm_min_epu32(wanted, lastInterval);
        const __m128i inside = _mm_cmpeq_epi32(k, wanted);
        __m128i a = k;
        if constexpr (isCubic) {
            const __m128i before = _mm_max_epi32(_mm_sub_epi32(k, one), _mm_setzero_si128());
            a = _mm_add_epi32(_mm_min_epi32(before, _mm_set1_epi32(curve.count - 4)), one);
        }
        const __m128i words = detail::fourWords(block + x);
        __m256d v;
        if constexpr (std::is_floating_point_v<T>)
            v = _mm256_cvtps_pd(_mm_castsi128_ps(words));
        else
            v = _mm256_cvtepi32_pd(words);
        const __m256d d = _mm256_sub_pd(v, detail::fourAt(curve.levels, a)), base = detail::fourAt(curve.values, a);
        const auto coefficients = [&](int power) {
            return solved == Solved::byElement ? _mm256_loadu_pd(curve.c[power] + x)
                                               : detail::fourAt(curve.c[power], k);
        };
        __m256d r;
        if constexpr (isCubic)
            r = detail::evaluateCubic(d, base, coefficients(0), coefficients(1), coefficients(2));
        else
            r = detail::evaluateLine(d, base, coefficients(0));
        if constexpr (std::is_floating_point_v<T>) {
            const __m128i mapped = _mm_castps_si128(_mm256_cvtpd_ps(r));
            _mm_storeu_si128(reinterpret_cast<__m128i*>(block + x), _mm_blendv_epi8(words, mapped, inside));
        } else {
            detail::storeFour(block + x, _mm_blendv_epi8(words, detail::toWords<T, isCubic>(r), inside));
        }
    }
}

}  // namespace qori::kernels
