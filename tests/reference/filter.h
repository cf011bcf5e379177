// SPDX-License-Identifier: Apache-2.0
// The general linear filter by its definition, one output at a time.
#pragma once
#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>
#include <vector>

#include "qori.h"

namespace qori::test::reference {

/// Coefficients row by row, as the caller has them.
template <class K>
struct Kernel {
    int width, height;
    std::vector<K> values;

    K at(int i, int j) const {
        return values[static_cast<size_t>(j) * static_cast<size_t>(width) + static_cast<size_t>(i)];
    }
};

/// numerator / denominator to an integer; exact.
inline int64_t divideRounded(int64_t numerator, int64_t denominator, int32_t mode) {
    if (denominator < 0) numerator = -numerator, denominator = -denominator;
    const int64_t magnitude = std::abs(numerator), whole = magnitude / denominator, rest = magnitude % denominator;
    bool up = false;
    if (mode == roundNearestEven) up = 2 * rest > denominator || (2 * rest == denominator && whole % 2 == 1);
    if (mode == roundHalfAway) up = 2 * rest >= denominator;
    return numerator < 0 ? -(whole + up) : whole + up;
}

inline double roundDouble(double x, int32_t mode) {
    const double whole = std::trunc(x), rest = std::abs(x - whole);
    const bool odd = std::fmod(whole, 2) != 0;
    const bool away =
        mode == roundHalfAway ? rest >= 0.5 : mode == roundNearestEven && (rest > 0.5 || (rest == 0.5 && odd));
    return away ? whole + std::copysign(1, x) : whole;
}

template <class D, class Wide>
Wide clampTo(Wide x) {
    return std::clamp(x, static_cast<Wide>(std::numeric_limits<D>::min()),
                      static_cast<Wide>(std::numeric_limits<D>::max()));
}

/// Sum of K(i, j) * pixel(ax - i, ay - j), pixel() by its offset from the output's own.
template <class K, class Fetch>
int64_t integerSum(const Kernel<K>& kernel, int ax, int ay, Fetch pixel) {
    int64_t sum = 0;
    for (int j = 0; j < kernel.height; ++j)
        for (int i = 0; i < kernel.width; ++i) sum += int64_t{kernel.at(i, j)} * pixel(ax - i, ay - j);
    return sum;
}

/// The sum in a wider type, and the sum of the magnitudes of its terms.
struct FloatSum {
    long double value = 0, magnitudes = 0;
};

template <class K, class Fetch>
FloatSum floatSum(const Kernel<K>& kernel, int ax, int ay, Fetch pixel) {
    FloatSum sum;
    for (int j = 0; j < kernel.height; ++j)
        for (int i = 0; i < kernel.width; ++i) {
            const long double term = static_cast<long double>(kernel.at(i, j)) * pixel(ax - i, ay - j);
            sum.value += term;
            sum.magnitudes += std::abs(term);
        }
    return sum;
}

}  // namespace qori::test::reference
