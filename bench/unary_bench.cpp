// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>

#include "unary_row.h"

namespace qori::bench {
namespace {

/// Functors, so that the plain loops see through them.
template <class T>
struct Absolute {
    T operator()(T x) const { return static_cast<T>(std::min<int>(std::abs(x), std::numeric_limits<T>::max())); }
};
template <>
struct Absolute<float> {
    float operator()(float x) const { return std::fabs(x); }
};

/// Rounded from the real result.
template <class T, class Function>
struct Rounded {
    T operator()(T x) const {
        return static_cast<T>(std::clamp<float>(std::nearbyint(Function{}(static_cast<float>(x))),
                                                std::numeric_limits<T>::min(), std::numeric_limits<T>::max()));
    }
};
struct Square {
    float operator()(float x) const { return x * x; }
};
struct Root {
    float operator()(float x) const { return std::sqrt(x); }
};
struct Exponential {
    float operator()(float x) const { return std::exp(x); }
};
struct Logarithm {
    float operator()(float x) const { return std::log(x); }
};

template <class T, class Function, class Ours>
Row integers(std::string name, Ours ours, T (*prepare)(T) = nullptr) {
    return unaryRow<T, T>(
        std::move(name), 1, [=](auto... a) { return ours(a..., 0); }, Rounded<T, Function>{}, 0, 0, prepare);
}

/// Where neither function overflows, so that no contender takes a way for special values.
float exponent(float x) { return x * .6f - 80; }
float positive(float x) { return x + .5f; }
template <class T>
T atLeastOne(T x) {
    return std::max<T>(x, 1);
}

const Rows rows{{
    unaryRow<int16_t, int16_t>("abs 16s C1", 1, qoriAbs_16s_C1R, Absolute<int16_t>{}),
    unaryRow<float, float>("abs 32f C1", 1, qoriAbs_32f_C1R, Absolute<float>{}),
    integers<uint8_t, Square>("sqr 8u C1 sfs 0", qoriSqr_8u_C1RSfs),
    integers<uint16_t, Square>("sqr 16u C1 sfs 0", qoriSqr_16u_C1RSfs),
    unaryRow<float, float>("sqr 32f C1", 1, qoriSqr_32f_C1R, Square{}),
    integers<uint8_t, Root>("sqrt 8u C1 sfs 0", qoriSqrt_8u_C1RSfs),
    integers<uint16_t, Root>("sqrt 16u C1 sfs 0", qoriSqrt_16u_C1RSfs),
    unaryRow<float, float>("sqrt 32f C1", 1, qoriSqrt_32f_C1R, Root{}),
    integers<uint8_t, Exponential>("exp 8u C1 sfs 0", qoriExp_8u_C1RSfs),
    integers<int16_t, Exponential>("exp 16s C1 sfs 0", qoriExp_16s_C1RSfs),
    unaryRow<float, float>("exp 32f C1", 1, qoriExp_32f_C1R, Exponential{}, 0, 0, exponent, 1e-6),
    integers<uint8_t, Logarithm>("ln 8u C1 sfs 0", qoriLn_8u_C1RSfs, atLeastOne<uint8_t>),
    integers<int16_t, Logarithm>("ln 16s C1 sfs 0", qoriLn_16s_C1RSfs, atLeastOne<int16_t>),
    unaryRow<float, float>("ln 32f C1", 1, qoriLn_32f_C1R, Logarithm{}, 0, 0, positive, 1e-6),
}};

}  // namespace
}  // namespace qori::bench
