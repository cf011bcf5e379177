// SPDX-License-Identifier: Apache-2.0
// The scalar truth of conversion and scaling, in 64-bit integers and floats.
#pragma once
#include <cmath>
#include <cstdint>
#include <limits>
#include <type_traits>

namespace qori::test::reference {

template <class D>
D saturate(int64_t value) {
    using Limits = std::numeric_limits<D>;
    if (value < int64_t{Limits::min()}) return Limits::min();
    if (value > int64_t{Limits::max()}) return Limits::max();
    return static_cast<D>(value);
}

template <class S, class D>
D convertInteger(S x) {
    if constexpr (std::is_floating_point_v<D>) {
        // The nearest float by hand, as the mode that a cast would use is the caller's.
        const double exact = static_cast<double>(x);
        const auto below = static_cast<float>(exact);
        const float candidates[3] = {std::nextafter(below, -INFINITY), below, std::nextafter(below, INFINITY)};
        float best = below;
        for (float c : candidates) {
            const double d = std::abs(c - exact), b = std::abs(best - exact);
            uint32_t bits;
            __builtin_memcpy(&bits, &c, sizeof bits);
            if (d < b || (d == b && bits % 2 == 0)) best = c;
        }
        return best;
    } else {
        return saturate<D>(int64_t{x});
    }
}

/// |x| * 2^-scaleFactor rounded by mode, with x's sign, saturated.
template <class S, class D>
D scaleInteger(S x, int roundMode, int scaleFactor) {
    const int64_t value = x, magnitude = value < 0 ? -value : value, sign = value < 0 ? -1 : 1;
    constexpr int64_t kHuge = int64_t{1} << 40;
    if (scaleFactor <= 0) {
        const int shift = scaleFactor < -40 ? 40 : -scaleFactor;
        const bool overflows = magnitude > (kHuge >> shift);
        return saturate<D>(sign * (magnitude == 0 ? 0 : overflows ? kHuge : magnitude << shift));
    }
    if (scaleFactor > 40) return 0;
    const int64_t unit = int64_t{1} << scaleFactor, whole = magnitude / unit, rest = magnitude % unit;
    const bool up = roundMode == 0   ? false
                    : roundMode == 1 ? 2 * rest > unit || (2 * rest == unit && whole % 2 == 1)
                                     : 2 * rest >= unit;
    return saturate<D>(sign * (whole + up));
}

/// x * 2^-scaleFactor, rounded and saturated. A double holds the product exactly wherever it is not huge or far below a
/// half.
template <class D>
D convertFloat(float x, int roundMode, int scaleFactor) {
    using Limits = std::numeric_limits<D>;
    constexpr bool isUnsigned32 = std::is_same_v<D, uint32_t>;
    if (isUnsigned32 && scaleFactor < -159) return x > 0 ? Limits::max() : 0;
    if (std::isnan(x)) return isUnsigned32 ? Limits::max() : Limits::min();
    if (isUnsigned32 && scaleFactor > 128) return 0;
    const int factor = scaleFactor > 800 ? 800 : scaleFactor < -800 ? -800 : scaleFactor;
    const double value = std::ldexp(static_cast<double>(x), -factor);
    if (value >= 1e10) return Limits::max();
    if (value <= -1e10) return Limits::min();
    const auto whole = static_cast<int64_t>(value);  // toward zero
    const double rest = std::abs(value - static_cast<double>(whole));
    const bool up = roundMode == 0   ? false
                    : roundMode == 1 ? rest > 0.5 || (rest == 0.5 && whole % 2 != 0)
                                     : rest >= 0.5;
    return saturate<D>(whole + (up ? (value < 0 ? -1 : 1) : 0));
}

inline uint8_t nearestByte(double value) {
    const double whole = std::floor(value), rest = value - whole;
    const auto integer = static_cast<int64_t>(whole);
    return saturate<uint8_t>(integer + (rest > 0.5 || (rest == 0.5 && integer % 2 != 0)));
}

}  // namespace qori::test::reference
