// SPDX-License-Identifier: Apache-2.0
// What packed operations make of one frequency: products, magnitudes and phases, of floats and of integers that are
// scaled by 2^-scale, rounded to nearest with ties to even and saturated.
#pragma once
#include <cstdint>
#include <limits>

#include "scaled_integers.h"

namespace qori::kernels {

/// A frequency of a spectrum.
template <class T>
struct Frequency {
    T re, im;
};

/// v * 2^-scale to nearest, ties to even, saturated, of any v and scale.
template <class T>
T scaledToNearest(int64_t v, int32_t scale) {
    constexpr int64_t low = std::numeric_limits<T>::min(), high = std::numeric_limits<T>::max();
    if (scale < 0) {
        const int32_t bits = scale < -32 ? 32 : -scale;
        v = v > high ? high : v < low ? low : v;  // 32 bits more fit
        v *= int64_t{1} << bits;
    } else if (scale > 63) {
        return 0;  // at most 2^63 / 2^64, a tie
    } else if (scale > 0) {
        const bool isNegative = v < 0;
        const uint64_t size = isNegative ? 0 - static_cast<uint64_t>(v) : static_cast<uint64_t>(v);
        const uint64_t half = uint64_t{1} << (scale - 1), rest = size & (2 * half - 1);
        const uint64_t whole = size >> scale;
        const auto rounded = static_cast<int64_t>(whole + (rest > half || (rest == half && whole % 2 == 1)));
        v = isNegative ? -rounded : rounded;
    }
    return static_cast<T>(v > high ? high : v < low ? low : v);
}

/// (a + ib)(c + id), or with the conjugate of the second.
template <bool conjugate>
struct FloatProduct {
    float real(float a, float b) const { return a * b; }
    Frequency<float> operator()(Frequency<float> a, Frequency<float> b) const {
        const float im = conjugate ? -b.im : b.im;
        return {__builtin_fmaf(a.re, b.re, -(a.im * im)), __builtin_fmaf(a.re, im, a.im * b.re)};
    }
};

/// Sums of two products of 32 bits fit 64 but for one, 2^63, of four factors of -2^31: one less rounds alike.
template <class T>
struct IntegerProduct {
    int32_t scale;

    T real(T a, T b) const { return scaledToNearest<T>(int64_t{a} * b, scale); }
    Frequency<T> operator()(Frequency<T> a, Frequency<T> b) const {
        int64_t im;
        if (__builtin_add_overflow(int64_t{a.re} * b.im, int64_t{a.im} * b.re, &im))
            im = std::numeric_limits<int64_t>::max();
        return {scaledToNearest<T>(int64_t{a.re} * b.re - int64_t{a.im} * b.im, scale), scaledToNearest<T>(im, scale)};
    }
};

/// Squares of floats neither overflow nor vanish in double precision.
struct FloatMagnitude {
    float operator()(Frequency<float> f) const {
        const double re = f.re, im = f.im;
        return static_cast<float>(__builtin_sqrt(re * re + im * im));
    }
    float mirrored(float value, Frequency<float>) const { return value; }
};

/// The root of the exact sum of squares, rounded as if it were exact.
template <class T>
struct IntegerMagnitude {
    int32_t scale;
    double factor = factorOfScale(scale);

    T operator()(Frequency<T> f) const {
        // Up to 2^63. A double's root of it is off by 2^-52 of it at most: only near a half does that matter, never
        // for 16 bits, whose sums have at most 32.
        const auto squareOf = [](T v) { return static_cast<uint64_t>(int64_t{v} * v); };
        const uint64_t square = squareOf(f.re) + squareOf(f.im);
        constexpr double high = std::numeric_limits<T>::max();
        const double guess = __builtin_sqrt(static_cast<double>(square)) * factor;
        if (guess > high) return std::numeric_limits<T>::max();
        const auto below = static_cast<int64_t>(guess);
        const double beyond = guess - static_cast<double>(below) - 0.5;
        if (beyond > 1e-3) return static_cast<T>(below + 1);
        if (beyond < -1e-3) return static_cast<T>(below);
        // (below + 1/2)^2 against the square, both times 4^scale and as large as the square or 4 times the result's.
        auto half = static_cast<uint64_t>(2 * below + 1);
        half *= half;
        const uint64_t left = scale > 0 ? square : square << (2 - 2 * scale);
        const uint64_t right = scale > 0 ? half << (2 * scale - 2) : half;
        return static_cast<T>(below + (left > right || (left == right && below % 2 == 1)));
    }
    T mirrored(T value, Frequency<T>) const { return value; }
};

/// atan2(im, re) above -pi and up to pi, to about 2^-52; zeros have no sign.
double phaseOf(double re, double im);

struct FloatPhase {
    float operator()(Frequency<float> f) const {
        return static_cast<float>(phaseOf(static_cast<double>(f.re), static_cast<double>(f.im)));
    }
    float mirrored(float value, Frequency<float> f) const { return f.im == 0 ? value : -value; }
};

template <class T>
struct IntegerPhase {
    int32_t scale;
    double factor = factorOfScale(scale);

    T operator()(Frequency<T> f) const { return rounded(phaseOf(f.re, f.im)); }
    T mirrored(T value, Frequency<T> f) const { return f.im == 0 ? value : rounded(-phaseOf(f.re, f.im)); }

private:
    T rounded(double phase) const {
        constexpr double low = std::numeric_limits<T>::min(), high = std::numeric_limits<T>::max();
        const double scaled = phase * factor;
        return static_cast<T>(__builtin_rint(scaled > high ? high : scaled < low ? low : scaled));
    }
};

}  // namespace qori::kernels
