// SPDX-License-Identifier: Apache-2.0
// The floating-point control register (MXCSR) belongs to the caller, who may round elsewhere, flush subnormals or have
// exceptions trap. A family whose instructions read it, and every floating-point instruction but moves, bitwise ones
// and shuffles does, either runs its body here or says beside the instruction why nothing depends on it.
#pragma once
#include <immintrin.h>

#include <type_traits>

#include "qori.h"

namespace qori {

namespace detail {

/// A function of its own, called through a pointer that the compiler cannot see through: no arithmetic moves across the
/// changes of the register.
template <class Body>
QorResult runBody(Body* body) {
    return (*body)();
}

}  // namespace detail

/// Runs body with the register at its default: rounding to nearest, exceptions masked, subnormals kept. Then it is as
/// the caller had it, flags included where it differed.
template <class Body>
QorResult underDefaultControl(Body body) {
    constexpr unsigned kDefault = 0x1F80, kFlags = 0x3F;
    QorResult (*run)(Body*) = detail::runBody<Body>;
    __asm__ volatile("" : "+r"(run));
    const unsigned callers = _mm_getcsr();
    const bool differs = (callers & ~kFlags) != kDefault;
    if (differs) _mm_setcsr(kDefault);
    const QorResult result = run(&body);
    if (differs) _mm_setcsr(callers);
    return result;
}

/// As underDefaultControl where elements are floats. For families whose integer members compute with integer
/// instructions only.
template <class T, class Body>
QorResult underControlOf(Body body) {
    if constexpr (std::is_floating_point_v<T>)
        return underDefaultControl(body);
    else
        return body();
}

}  // namespace qori
