// SPDX-License-Identifier: Apache-2.0
// Affine warp by its definition: the position of a destination pixel in extended precision, weights and taps around it.
#pragma once
#include <algorithm>
#include <array>
#include <cmath>

#include "reference/resize.h"

namespace qori::test::reference {

/// (x, y) to (c[0] x + c[1] y + c[2], c[3] x + c[4] y + c[5]).
using Coefficients = std::array<double, 6>;
using Real = long double;

struct Position {
    Real x, y;
};

/// Where a destination pixel lies in the source; isBackward where the coefficients say so themselves.
inline Position positionOf(const Coefficients& c, bool isBackward, int x, int y) {
    const Real a = c[0], b = c[1], d = c[3], e = c[4];
    if (isBackward) return {a * x + b * y + c[2], d * x + e * y + c[5]};
    const Real u = x - Real{c[2]}, v = y - Real{c[5]}, determinant = a * e - b * d;
    return {(e * u - b * v) / determinant, (a * v - d * u) / determinant};
}

/// Taps of one direction before any border.
inline std::vector<Tap> tapsAt(const Method& m, Real position) {
    const Real whole = std::floor(position);
    const int first = static_cast<int>(whole), reach = m.interpolation == interpCubic ? 2 : 1;
    std::vector<Tap> taps;
    for (int i = first + 1 - reach; i <= first + reach; ++i)
        taps.push_back({i, kernel(m, static_cast<double>(position - i))});
    return taps;
}

struct Mixed {
    double value = 0;
    double largestTap = 0;
    double gain = 0;  ///< Sum of the weights' magnitudes.
};

template <class Fetch>
Mixed mixAt(const Method& m, Position at, Fetch fetch) {
    Mixed mixed;
    Real sum = 0, gain = 0;
    for (const Tap& row : tapsAt(m, at.y))
        for (const Tap& column : tapsAt(m, at.x)) {
            const double element = fetch(column.index, row.index);
            sum += Real{row.weight} * column.weight * element;
            gain += std::abs(Real{row.weight} * column.weight);
            mixed.largestTap = std::max(mixed.largestTap, std::abs(element));
        }
    mixed.value = static_cast<double>(sum);
    mixed.gain = static_cast<double>(gain);
    return mixed;
}

}  // namespace qori::test::reference
