// SPDX-License-Identifier: Apache-2.0
// Arithmetic with a scale factor, one element at a time, in exact numbers of sign and magnitude.
#pragma once
#include <immintrin.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <limits>
#include <type_traits>

#include "keeps_nan.h"
#include "qori.h"

namespace qori::test::reference {

struct Exact {
    bool negative;
    uint64_t magnitude;
};
inline Exact exact(int64_t v) { return {v < 0, v < 0 ? 0 - static_cast<uint64_t>(v) : static_cast<uint64_t>(v)}; }
inline Exact operator-(Exact a) { return {!a.negative, a.magnitude}; }
/// Of magnitudes up to 2^32.
inline Exact operator*(Exact a, Exact b) { return {a.negative != b.negative, a.magnitude * b.magnitude}; }
inline Exact operator+(Exact a, Exact b) {
    if (a.negative == b.negative) return {a.negative, a.magnitude + b.magnitude};
    if (a.magnitude < b.magnitude) return {b.negative, b.magnitude - a.magnitude};
    return {a.negative, a.magnitude - b.magnitude};
}

/// 192 bits: numerators up to 2^63 * 2^100 and denominators up to 2^63 * 2^66, with room to double them.
struct Big {
    std::array<uint32_t, 6> limb{};  // the most significant first, so that they compare as arrays do

    explicit Big(uint64_t v = 0) : limb{0, 0, 0, 0, static_cast<uint32_t>(v >> 32), static_cast<uint32_t>(v)} {}
    Big doubled(uint32_t carry = 0) const {
        Big r;
        for (size_t i = 6; i-- > 0; carry = limb[i] >> 31) r.limb[i] = limb[i] << 1 | carry;
        return r;
    }
    Big minus(const Big& b) const {
        Big r;
        int64_t borrow = 0;
        for (size_t i = 6; i-- > 0;) {
            const int64_t d = int64_t{limb[i]} - b.limb[i] + borrow;
            r.limb[i] = static_cast<uint32_t>(d);
            borrow = d >> 32;
        }
        return r;
    }
    bool operator>=(const Big& b) const { return limb >= b.limb; }
    bool operator>(const Big& b) const { return limb > b.limb; }
    bool operator==(const Big& b) const { return limb == b.limb; }
};

/// numerator * 2^-scale / denominator, rounded; some value above 2^32 where it is beyond.
inline uint64_t scaledQuotient(uint64_t numerator, uint64_t denominator, int scale, int mode) {
    const int up = scale < 0 ? std::min(-(scale + 1), 99) + 1 : 0, down = std::clamp(scale, 0, 66);
    uint64_t q, r2IsAbove, r2IsEqual;  // quotient; how twice the remainder compares with the denominator
    if (std::bit_width(numerator) + up <= 63 && std::bit_width(denominator) + down <= 63) {
        const uint64_t n = numerator << up, d = denominator << down;
        q = n / d;
        r2IsAbove = 2 * (n % d) > d;
        r2IsEqual = 2 * (n % d) == d;
    } else {
        const int width = numerator == 0 ? 0 : static_cast<int>(std::bit_width(numerator)) + up;
        if (width + 2 <= static_cast<int>(std::bit_width(denominator)) + down) return 0;  // less than a half
        Big n{numerator}, d{denominator}, rest;
        for (int i = 0; i < up; ++i) n = n.doubled();
        for (int i = 0; i < down; ++i) d = d.doubled();
        q = 0;
        for (auto bit = static_cast<size_t>(192 - width); bit < 192; ++bit) {
            rest = rest.doubled(n.limb[bit / 32] >> (31 - bit % 32) & 1);
            const bool one = rest >= d;
            if (one) rest = rest.minus(d);
            q = q * 2 + one;
            if (q >> 40 != 0) return q;
        }
        r2IsAbove = rest.doubled() > d;
        r2IsEqual = rest.doubled() == d;
    }
    if (mode == roundTowardZero) return q;
    return q + (r2IsAbove || (r2IsEqual && (mode == roundHalfAway || q % 2 == 1)));
}

template <class T>
T saturated(bool negative, uint64_t magnitude) {
    using Limits = std::numeric_limits<T>;
    if (negative && magnitude >= exact(Limits::min()).magnitude) return Limits::min();
    if (negative) return static_cast<T>(-static_cast<int64_t>(magnitude));
    return magnitude >= static_cast<uint64_t>(Limits::max()) ? Limits::max() : static_cast<T>(magnitude);
}

template <class T>
T scaled(Exact v, int scale) {
    return saturated<T>(v.negative, scaledQuotient(v.magnitude, 1, scale, roundNearestEven));
}

template <class T>
constexpr bool isComplex = requires(T t) {
    t.re;
};
template <class T>
constexpr bool isFloat = std::is_same_v<T, float> || std::is_same_v<T, QorComplex32f>;

/// f(parts of a, parts of b) for each part of an element.
template <class T, class F>
T byPart(T a, T b, F f) {
    if constexpr (isComplex<T>)
        return {f(a.re, b.re), f(a.im, b.im)};
    else
        return f(a, b);
}

template <class T>
T add(T a, T b, int scale) {
    return byPart(a, b, [&](auto x, auto y) {
        if constexpr (isFloat<T>)
            return x + y;
        else
            return scaled<decltype(x)>(exact(x) + exact(y), scale);
    });
}

/// b - a.
template <class T>
T subtract(T a, T b, int scale) {
    return byPart(a, b, [&](auto x, auto y) {
        if constexpr (isFloat<T>)
            return y - x;
        else
            return scaled<decltype(x)>(exact(y) + -exact(x), scale);
    });
}

template <class T>
T multiply(T a, T b, int scale) {
    if constexpr (std::is_same_v<T, float>) {
        return a * b;
    } else if constexpr (std::is_same_v<T, QorComplex32f>) {
        return {a.re * b.re - a.im * b.im, a.re * b.im + a.im * b.re};
    } else if constexpr (isComplex<T>) {
        using C = decltype(a.re);
        const Exact p = exact(a.re), q = exact(a.im), r = exact(b.re), t = exact(b.im);
        return {scaled<C>(p * r + -(q * t), scale), scaled<C>(p * t + q * r, scale)};
    } else {
        return scaled<T>(exact(a) * exact(b), scale);
    }
}

/// a * b / max, to nearest.
template <class T>
T multiplyFractions(T a, T b) {
    return static_cast<T>(scaledQuotient(uint64_t{a} * b, std::numeric_limits<T>::max(), 0, roundNearestEven));
}

template <class T>
bool isZero(T a) {
    if constexpr (isComplex<T>)
        return a.re == 0 && a.im == 0;
    else
        return a == 0;
}

QORI_KEEPS_NAN float floatFromBits(uint32_t bits) {
    float f;
    __builtin_memcpy(&f, &bits, sizeof f);
    return f;
}

/// numerator over a zero of the sign of `zero`.
QORI_KEEPS_NAN float overZero(float numerator, float zero) {
    if (numerator == 0 || std::isnan(numerator)) return floatFromBits(0x7FBFFFFF);
    const float infinity = std::numeric_limits<float>::infinity();
    return std::signbit(numerator) != std::signbit(zero) ? -infinity : infinity;
}

/// The quotient is defined by the processor's reciprocal, so that no other arithmetic can stand in for it here.
inline float divideByReciprocal(float d, float n) {
    const float r = _mm_cvtss_f32(_mm_rcp_ss(_mm_set_ss(d)));
    const float e = std::fma(-d, r, 1.f), q = n * r;
    return std::fma(std::fma(q, e, q), e, q);
}

/// b / a.
template <class T>
QORI_KEEPS_NAN T divide(T a, T b, int scale, int mode = roundNearestEven) {
    const auto rounded = [&]<class C>(C, Exact n, Exact d) {
        return saturated<C>(n.negative != d.negative, scaledQuotient(n.magnitude, d.magnitude, scale, mode));
    };
    if constexpr (std::is_same_v<T, float>) {
        return isZero(a) ? overZero(b, a) : divideByReciprocal(a, b);
    } else if constexpr (std::is_same_v<T, QorComplex32f>) {
        if (isZero(a)) return {overZero(b.re, 0.f), overZero(b.im, 0.f)};
        const double p = a.re, q = a.im, r = b.re, t = b.im, norm = p * p + q * q;
        return {static_cast<float>((r * p + t * q) / norm), static_cast<float>((t * p - r * q) / norm)};
    } else if (isZero(a)) {
        return byPart(a, b, [](auto, auto n) {
            using C = decltype(n);
            return saturated<C>(n < 0, n == 0 ? 0 : UINT64_MAX);
        });
    } else if constexpr (isComplex<T>) {
        const Exact p = exact(a.re), q = exact(a.im), r = exact(b.re), t = exact(b.im), norm = p * p + q * q;
        return {rounded(a.re, r * p + t * q, norm), rounded(a.re, t * p + -(r * q), norm)};
    } else {
        return rounded(a, exact(b), exact(a));
    }
}

}  // namespace qori::test::reference
