// SPDX-License-Identifier: Apache-2.0
// Complex numbers in lanes and their short transforms. A line is eight of them in memory: eight real parts, then eight
// imaginary ones.
#pragma once
#include "kernels/vector_math.h"

namespace qori::kernels {

inline constexpr int kLineColumns = 8, kLineFloats = 16, kLineBytes = 64;

struct ComplexLine {
    Vec<float> re, im;
};

namespace line {

QORI_INLINE ComplexLine loadLine(const float* p) { return {load(p), load(p + kLineColumns)}; }
QORI_INLINE void storeLine(float* p, ComplexLine a) {
    store(p, a.re);
    store(p + kLineColumns, a.im);
}

/// a * b + c, a * b - c and c - a * b, rounded once.
QORI_INLINE Vec<float> mulAdd(Vec<float> a, Vec<float> b, Vec<float> c) { return {_mm256_fmadd_ps(a.v, b.v, c.v)}; }
QORI_INLINE Vec<float> mulSub(Vec<float> a, Vec<float> b, Vec<float> c) { return {_mm256_fmsub_ps(a.v, b.v, c.v)}; }
QORI_INLINE Vec<float> negMulAdd(Vec<float> a, Vec<float> b, Vec<float> c) { return {_mm256_fnmadd_ps(a.v, b.v, c.v)}; }

QORI_INLINE ComplexLine operator+(ComplexLine a, ComplexLine b) { return {a.re + b.re, a.im + b.im}; }
QORI_INLINE ComplexLine operator-(ComplexLine a, ComplexLine b) { return {a.re - b.re, a.im - b.im}; }
/// a + i b and a - i b.
QORI_INLINE ComplexLine plusI(ComplexLine a, ComplexLine b) { return {a.re - b.im, a.im + b.re}; }
QORI_INLINE ComplexLine minusI(ComplexLine a, ComplexLine b) { return {a.re + b.im, a.im - b.re}; }

QORI_INLINE ComplexLine times(ComplexLine a, Vec<float> re, Vec<float> im) {
    return {mulSub(a.re, re, a.im * im), mulAdd(a.re, im, a.im * re)};
}
/// By the complex number at w, the same in all lanes.
QORI_INLINE ComplexLine times(ComplexLine a, const float* w) { return times(a, splat(w[0]), splat(w[1])); }
/// c + a * s.
QORI_INLINE ComplexLine mulAdd(ComplexLine a, Vec<float> s, ComplexLine c) {
    return {mulAdd(a.re, s, c.re), mulAdd(a.im, s, c.im)};
}
QORI_INLINE ComplexLine negMulAdd(ComplexLine a, Vec<float> s, ComplexLine c) {
    return {negMulAdd(a.re, s, c.re), negMulAdd(a.im, s, c.im)};
}

/// Forward transforms of 2, 4 and 8 points in place.
QORI_INLINE void butterfly(ComplexLine (&a)[2]) {
    const ComplexLine b = a[1];
    a[1] = a[0] - b;
    a[0] = a[0] + b;
}

QORI_INLINE void butterfly(ComplexLine (&a)[4]) {
    const ComplexLine s0 = a[0] + a[2], d0 = a[0] - a[2], s1 = a[1] + a[3], d1 = a[1] - a[3];
    a[0] = s0 + s1;
    a[1] = minusI(d0, d1);
    a[2] = s0 - s1;
    a[3] = plusI(d0, d1);
}

QORI_INLINE void butterfly(ComplexLine (&a)[8]) {
    const ComplexLine d0 = a[0] - a[4], d1 = a[1] - a[5], d2 = a[2] - a[6], d3 = a[3] - a[7];
    ComplexLine even[4] = {a[0] + a[4], a[1] + a[5], a[2] + a[6], a[3] + a[7]};
    butterfly(even);
    a[0] = even[0];
    a[2] = even[1];
    a[4] = even[2];
    a[6] = even[3];
    // The odd ones turn by eighths: (1 - i) d1 and -(1 + i) d3, the root of a half joining in the last sums.
    const Vec<float> half = splat(0.70710678118654752f);
    const ComplexLine e1 = {d1.re + d1.im, d1.im - d1.re}, e3 = {d3.im - d3.re, zero<float>() - (d3.re + d3.im)};
    const ComplexLine u0 = minusI(d0, d2), u1 = plusI(d0, d2), s = e1 + e3, d = e1 - e3;
    a[1] = mulAdd(s, half, u0);
    a[5] = negMulAdd(s, half, u0);
    a[3] = {mulAdd(d.im, half, u1.re), negMulAdd(d.re, half, u1.im)};
    a[7] = {negMulAdd(d.im, half, u1.re), mulAdd(d.re, half, u1.im)};
}

/// Of p points, p odd: `turns` has the cosines and the sines of 2 pi k / p for 0 < k <= (p - 1) / 2.
template <int p>
QORI_INLINE void butterfly(ComplexLine (&a)[p], const float* turns) {
    constexpr int h = p / 2;
    ComplexLine s[h], d[h];
    for (int q = 0; q < h; ++q) {
        s[q] = a[q + 1] + a[p - 1 - q];
        d[q] = a[q + 1] - a[p - 1 - q];
    }
    const ComplexLine first = a[0];
    for (int q = 0; q < h; ++q) a[0] = a[0] + s[q];
#pragma GCC unroll 8
    for (int m = 1; m <= h; ++m) {
        ComplexLine even = first, odd = {zero<float>(), zero<float>()};
#pragma GCC unroll 8
        for (int q = 1; q <= h; ++q) {
            const int turn = m * q % p, least = turn <= h ? turn : p - turn;
            even = mulAdd(s[q - 1], splat(turns[2 * least - 2]), even);
            const Vec<float> sine = splat(turns[2 * least - 1]);
            odd = turn <= h ? mulAdd(d[q - 1], sine, odd) : negMulAdd(d[q - 1], sine, odd);
        }
        a[m] = minusI(even, odd);
        a[p - m] = plusI(even, odd);
    }
}

}  // namespace line
}  // namespace qori::kernels
