// SPDX-License-Identifier: Apache-2.0
// Complex numbers in lanes and their short transforms. A line is a vector of them in memory, eight floats or four
// doubles: all real parts, then all imaginary ones.
#pragma once
#include "kernels/vector_math.h"

namespace qori::kernels {

inline constexpr int kLineColumns = 8, kLineFloats = 16, kLineBytes = 64;

template <class T>
struct ComplexLineOf {
    Vec<T> re, im;
};
using ComplexLine = ComplexLineOf<float>;

namespace line {

template <class T>
QORI_INLINE ComplexLineOf<T> loadLine(const T* p) {
    return {load(p), load(p + Vec<T>::lanes)};
}
template <class T>
QORI_INLINE void storeLine(T* p, ComplexLineOf<T> a) {
    store(p, a.re);
    store(p + Vec<T>::lanes, a.im);
}

/// a * b + c, a * b - c and c - a * b, rounded once.
QORI_INLINE Vec<float> mulAdd(Vec<float> a, Vec<float> b, Vec<float> c) { return {_mm256_fmadd_ps(a.v, b.v, c.v)}; }
QORI_INLINE Vec<float> mulSub(Vec<float> a, Vec<float> b, Vec<float> c) { return {_mm256_fmsub_ps(a.v, b.v, c.v)}; }
QORI_INLINE Vec<float> negMulAdd(Vec<float> a, Vec<float> b, Vec<float> c) { return {_mm256_fnmadd_ps(a.v, b.v, c.v)}; }
QORI_INLINE Vec<double> mulAdd(Vec<double> a, Vec<double> b, Vec<double> c) { return {_mm256_fmadd_pd(a.v, b.v, c.v)}; }
QORI_INLINE Vec<double> mulSub(Vec<double> a, Vec<double> b, Vec<double> c) { return {_mm256_fmsub_pd(a.v, b.v, c.v)}; }
QORI_INLINE Vec<double> negMulAdd(Vec<double> a, Vec<double> b, Vec<double> c) {
    return {_mm256_fnmadd_pd(a.v, b.v, c.v)};
}

template <class T>
QORI_INLINE ComplexLineOf<T> operator+(ComplexLineOf<T> a, ComplexLineOf<T> b) {
    return {a.re + b.re, a.im + b.im};
}
template <class T>
QORI_INLINE ComplexLineOf<T> operator-(ComplexLineOf<T> a, ComplexLineOf<T> b) {
    return {a.re - b.re, a.im - b.im};
}
/// a + i b and a - i b.
template <class T>
QORI_INLINE ComplexLineOf<T> plusI(ComplexLineOf<T> a, ComplexLineOf<T> b) {
    return {a.re - b.im, a.im + b.re};
}
template <class T>
QORI_INLINE ComplexLineOf<T> minusI(ComplexLineOf<T> a, ComplexLineOf<T> b) {
    return {a.re + b.im, a.im - b.re};
}

template <class T>
QORI_INLINE ComplexLineOf<T> times(ComplexLineOf<T> a, Vec<T> re, Vec<T> im) {
    return {mulSub(a.re, re, a.im * im), mulAdd(a.re, im, a.im * re)};
}
/// By the complex number at w, the same in all lanes.
template <class T>
QORI_INLINE ComplexLineOf<T> times(ComplexLineOf<T> a, const T* w) {
    return times(a, splat(w[0]), splat(w[1]));
}
/// c + a * s.
template <class T>
QORI_INLINE ComplexLineOf<T> mulAdd(ComplexLineOf<T> a, Vec<T> s, ComplexLineOf<T> c) {
    return {mulAdd(a.re, s, c.re), mulAdd(a.im, s, c.im)};
}
template <class T>
QORI_INLINE ComplexLineOf<T> negMulAdd(ComplexLineOf<T> a, Vec<T> s, ComplexLineOf<T> c) {
    return {negMulAdd(a.re, s, c.re), negMulAdd(a.im, s, c.im)};
}

/// The parts of eight complex numbers, and back. Lanes hold numbers 0, 1, 4, 5, 2, 3, 6, 7.
QORI_INLINE ComplexLine separate(Vec<float> a, Vec<float> b) {
    return {{_mm256_shuffle_ps(a.v, b.v, 0x88)}, {_mm256_shuffle_ps(a.v, b.v, 0xDD)}};
}
QORI_INLINE void interleave(ComplexLine line, Vec<float>& a, Vec<float>& b) {
    a = {_mm256_unpacklo_ps(line.re.v, line.im.v)};
    b = {_mm256_unpackhi_ps(line.re.v, line.im.v)};
}

/// Forward transforms of 2, 4 and 8 points in place.
template <class T>
QORI_INLINE void butterfly(ComplexLineOf<T> (&a)[2]) {
    const ComplexLineOf<T> b = a[1];
    a[1] = a[0] - b;
    a[0] = a[0] + b;
}

template <class T>
QORI_INLINE void butterfly(ComplexLineOf<T> (&a)[4]) {
    const ComplexLineOf<T> s0 = a[0] + a[2], d0 = a[0] - a[2], s1 = a[1] + a[3], d1 = a[1] - a[3];
    a[0] = s0 + s1;
    a[1] = minusI(d0, d1);
    a[2] = s0 - s1;
    a[3] = plusI(d0, d1);
}

template <class T>
QORI_INLINE void butterfly(ComplexLineOf<T> (&a)[8]) {
    const ComplexLineOf<T> d0 = a[0] - a[4], d1 = a[1] - a[5], d2 = a[2] - a[6], d3 = a[3] - a[7];
    ComplexLineOf<T> even[4] = {a[0] + a[4], a[1] + a[5], a[2] + a[6], a[3] + a[7]};
    butterfly(even);
    a[0] = even[0];
    a[2] = even[1];
    a[4] = even[2];
    a[6] = even[3];
    // The odd ones turn by eighths: (1 - i) d1 and -(1 + i) d3, the root of a half joining in the last sums.
    const Vec<T> half = splat(static_cast<T>(0.70710678118654752440));
    const ComplexLineOf<T> e1 = {d1.re + d1.im, d1.im - d1.re}, e3 = {d3.im - d3.re, zero<T>() - (d3.re + d3.im)};
    const ComplexLineOf<T> u0 = minusI(d0, d2), u1 = plusI(d0, d2), s = e1 + e3, d = e1 - e3;
    a[1] = mulAdd(s, half, u0);
    a[5] = negMulAdd(s, half, u0);
    a[3] = {mulAdd(d.im, half, u1.re), negMulAdd(d.re, half, u1.im)};
    a[7] = {negMulAdd(d.im, half, u1.re), mulAdd(d.re, half, u1.im)};
}

/// Of 3 points: products with the sine join the sums unrounded. turns: the cosine and the sine of a third of a turn.
template <class T>
QORI_INLINE void butterfly3(ComplexLineOf<T> (&a)[3], const T* turns) {
    const ComplexLineOf<T> s = a[1] + a[2], d = a[1] - a[2];
    const ComplexLineOf<T> even = mulAdd(s, splat(turns[0]), a[0]);
    const Vec<T> sine = splat(turns[1]);
    a[0] = a[0] + s;
    a[1] = {mulAdd(d.im, sine, even.re), negMulAdd(d.re, sine, even.im)};
    a[2] = {negMulAdd(d.im, sine, even.re), mulAdd(d.re, sine, even.im)};
}

/// Of p points, p odd: `turns` has the cosines and the sines of 2 pi k / p for 0 < k <= (p - 1) / 2.
template <int p, class T>
QORI_INLINE void butterfly(ComplexLineOf<T> (&a)[p], const T* turns) {
    if constexpr (p == 3) return butterfly3(a, turns);
    constexpr int h = p / 2;
    ComplexLineOf<T> s[h], d[h];
    for (int q = 0; q < h; ++q) {
        s[q] = a[q + 1] + a[p - 1 - q];
        d[q] = a[q + 1] - a[p - 1 - q];
    }
    const ComplexLineOf<T> first = a[0];
    for (int q = 0; q < h; ++q) a[0] = a[0] + s[q];
#pragma GCC unroll 8
    for (int m = 1; m <= h; ++m) {
        ComplexLineOf<T> even = first, odd = {zero<T>(), zero<T>()};
#pragma GCC unroll 8
        for (int q = 1; q <= h; ++q) {
            const int turn = m * q % p, least = turn <= h ? turn : p - turn;
            even = mulAdd(s[q - 1], splat(turns[2 * least - 2]), even);
            const Vec<T> sine = splat(turns[2 * least - 1]);
            odd = turn <= h ? mulAdd(d[q - 1], sine, odd) : negMulAdd(d[q - 1], sine, odd);
        }
        a[m] = minusI(even, odd);
        a[p - m] = plusI(even, odd);
    }
}

/// Of two real frequencies a and b in the places of the parts: a + b and a - b.
QORI_INLINE ComplexLine sumAndDifference(ComplexLine a) { return {a.re + a.im, a.re - a.im}; }

/// The first point, parts exchanged, of two such frequencies.
QORI_INLINE ComplexLine joinEnds(ComplexLine a) { return {a.re - a.im, a.re + a.im}; }

/// A point or frequency k and the one at n / 2 - k.
struct Halves {
    ComplexLine at, mirror;
};

/// From points z and y of the transform of n / 2 to frequencies of n; `root` is one of makeHalfRoots. Terms go from the
/// smallest to the largest, each product rounded with its sum: with sums and products apart the errors are a third
/// larger.
QORI_INLINE Halves splitHalf(ComplexLine z, ComplexLine y, const float* root) {
    const Vec<float> turn = splat(root[0]), low = splat(root[2]), high = splat(root[3]);
    const Vec<float> sum = z.im + y.im, difference = y.re - z.re;
    return {{mulAdd(high, y.re, mulAdd(turn, sum, low * z.re)),
             negMulAdd(high, y.im, mulAdd(turn, difference, low * z.im))},
            {mulAdd(high, z.re, negMulAdd(turn, sum, low * y.re)),
             negMulAdd(high, z.im, mulAdd(turn, difference, low * y.im))}};
}

/// From frequencies x and y to points, parts exchanged. Terms as in splitHalf, doubled at last: twice a frequency may
/// be infinite where the points are not.
QORI_INLINE Halves joinHalf(ComplexLine x, ComplexLine y, const float* root) {
    const Vec<float> turn = splat(root[0]), low = splat(root[2]), high = splat(root[3]);
    const Vec<float> sum = x.im + y.im, difference = x.re - y.re;
    const ComplexLine at = {negMulAdd(high, y.im, mulAdd(turn, difference, low * x.im)),
                            mulAdd(high, y.re, negMulAdd(turn, sum, low * x.re))};
    const ComplexLine mirror = {negMulAdd(high, x.im, mulAdd(turn, difference, low * y.im)),
                                mulAdd(high, x.re, mulAdd(turn, sum, low * y.re))};
    return {at + at, mirror + mirror};
}

}  // namespace line
}  // namespace qori::kernels
