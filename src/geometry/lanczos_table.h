// SPDX-License-Identifier: Apache-2.0
// The Lanczos kernel L(t) = a sin(pi t) sin(pi t / a) / (pi t)^2 for |t| < a, sampled at compile time.
#pragma once
#include <array>
#include <cstddef>
#include <cstdint>
#include <numbers>

#include "kernels/resize/weights.h"

namespace qori::geometry {

namespace detail {

/// Taylor series around 0; with |x| <= pi / 2 the terms behind x^25 are below 2^-60.
constexpr double sineNearZero(double x) {
    double term = x, sum = x;
    for (int n = 2; n <= 24; n += 2) {
        term *= -x * x / (n * (n + 1));
        sum += term;
    }
    return sum;
}

/// sin(pi t) for 0 <= t <= 3.
constexpr double sineOfPi(double t) {
    int turns = 0;
    while (t - turns > 0.5) ++turns;
    const double sine = sineNearZero(std::numbers::pi * (t - turns));
    return turns % 2 == 0 ? sine : -sine;
}

template <int lobes, int steps>
constexpr auto sampleLanczos() {
    std::array<double, lobes * steps + 1> table{};
    table[0] = 1;
    for (size_t i = 1; i < table.size() - 1; ++i) {
        const double t = static_cast<double>(i) / steps, x = std::numbers::pi * t;
        table[i] = lobes * sineOfPi(t) * sineOfPi(t / lobes) / (x * x);
    }
    return table;
}

inline constexpr auto kLanczos2 = sampleLanczos<2, 200>();
inline constexpr auto kLanczos3 = sampleLanczos<3, 100>();

}  // namespace detail

/// The kernel with 2 or 3 lobes, linear between samples 1/200 or 1/100 apart.
inline kernels::Filter lanczosFilter(int32_t lobes) {
    const double* const samples = lobes == 2 ? detail::kLanczos2.data() : detail::kLanczos3.data();
    return {kernels::Filter::Shape::samples, lobes, {}, samples, lobes == 2 ? 200 : 100};
}

}  // namespace qori::geometry
