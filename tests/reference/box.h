// SPDX-License-Identifier: Apache-2.0
// Means of windows, weighted or not, by their definitions.
#pragma once
#include <cmath>
#include <cstdint>
#include <limits>
#include <type_traits>

namespace qori::test::reference {

/// Rounded once, by way of a double that is exact below 2^51. In halves: GCC 12 for 32-bit Windows fails on conversions
/// from 64 bits where the stack is aligned to 4.
inline float toFloat(int64_t sum) {
    const double high = static_cast<int32_t>(sum >> 20), low = static_cast<int32_t>(sum & 0xFFFFF);
    return static_cast<float>(high * 0x1p20 + low);
}

/// The mean of integers: bytes by a float product, words exactly, to nearest, ties to even.
template <class T>
T meanOf(int64_t sum, int64_t area) {
    if constexpr (sizeof(T) == 1) {
        const volatile float reciprocal = 1.0f / toFloat(area);
        const volatile float mean = toFloat(sum) * reciprocal;
        return static_cast<T>(std::nearbyint(mean));
    } else {
        int64_t whole = sum / area, rest = sum % area;
        if (rest < 0) rest += area, --whole;
        return static_cast<T>(whole + (2 * rest > area || (2 * rest == area && (whole & 1) != 0)));
    }
}

/// A sum of weighted pixels: integers exactly, floats in a wider type with the sum of the magnitudes.
template <class T>
struct WindowSum {
    using Wide = std::conditional_t<std::is_floating_point_v<T>, long double, int64_t>;
    Wide value = 0, magnitudes = 0;
    void add(T pixel, int weight = 1) {
        const Wide term = static_cast<Wide>(pixel) * weight;
        value += term;
        magnitudes += term < 0 ? -term : term;
    }
};

}  // namespace qori::test::reference
