// SPDX-License-Identifier: Apache-2.0
// The scalar truth of the unary functions.
#pragma once
#include <cmath>
#include <cstdint>

#include "reference/convert.h"

namespace qori::test::reference {

/// value * 2^-scale to nearest, ties to even, saturated. Doubles decide every case here but exact ties, which are exact
/// in them: irrational results of 16-bit arguments keep a distance from halves that is far above a double's error.
template <class T>
T scaleReal(double value, int scale) {
    const double scaled = std::ldexp(value, scale > 2000 ? -2000 : scale < -2000 ? 2000 : -scale);
    if (scaled > 1e9) return std::numeric_limits<T>::max();
    const double whole = std::floor(scaled), rest = scaled - whole;
    const auto integer = static_cast<int64_t>(whole);
    return saturate<T>(integer + (rest > 0.5 || (rest == 0.5 && integer % 2 != 0)));
}

template <class T>
T square(T x, int scale) {
    return scaleReal<T>(static_cast<double>(x) * static_cast<double>(x), scale);
}

template <class T>
T squareRoot(T x, int scale) {
    return x <= 0 ? T{0} : scaleReal<T>(std::sqrt(static_cast<double>(x)), scale);
}

/// e^x overflows a double; scaled by 2^-scale before that it need not.
template <class T>
T exponential(T x, int scale) {
    if (x == 0) return scaleReal<T>(1.0, scale);
    const long double power = static_cast<long double>(x) * 1.442695040888963407359924681001892137L - scale;
    if (power > 40) return std::numeric_limits<T>::max();
    return power < -10 ? T{0} : scaleReal<T>(static_cast<double>(std::exp2(power)), 0);
}

template <class T>
T logarithm(T x, int scale) {
    return x <= 0 ? std::numeric_limits<T>::min() : scaleReal<T>(std::log(static_cast<double>(x)), scale);
}

}  // namespace qori::test::reference
