// SPDX-License-Identifier: Apache-2.0
// Weights of Gaussian bells, without a mathematics library. Under default control.
#pragma once
#include <cstdint>

namespace qori {

namespace detail {

/// 2^n for -1022 <= n <= 0.
inline double powerOfTwo(int n) {
    const uint64_t bits = static_cast<uint64_t>(1023 + n) << 52;
    double power;
    __builtin_memcpy(&power, &bits, sizeof power);
    return power;
}

}  // namespace detail

/// e^x for x <= 0, to a few units in the last place: x = n ln 2 + r with |r| <= ln 2 / 2, whose Taylor series ends
/// below 2^-57 after 13 terms.
inline double exponential(double x) {
    constexpr double kLn2High = 0.693147180369123816490, kLn2Low = 1.90821492927058770002e-10,
                     kLog2 = 1.4426950408889634;
    if (!(x > -745.2)) return x == x ? 0 : x;
    const int n = static_cast<int>(x * kLog2 - 0.5);
    const double r = x - n * kLn2High - n * kLn2Low;
    double sum = 1;
    for (int k = 13; k > 0; --k) sum = 1 + sum * r / k;
    return sum * detail::powerOfTwo(n / 2) * detail::powerOfTwo(n - n / 2);
}

}  // namespace qori
