// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <immintrin.h>

#include "kernels/simd.h"
#include "qori.h"

namespace qori::stats {

namespace detail {

/// Stands outside its caller, so that the compiler cannot move arithmetic across the changes of the control register.
template <class Body>
QORI_NOINLINE QorResult outOfLine(Body& body) {
    return body();
}

}  // namespace detail

/// Runs body with rounding to nearest, exceptions masked and subnormal numbers kept, whatever the caller has set.
template <class Body>
QorResult underDefaultRounding(Body body) {
    constexpr unsigned kDefault = 0x1F80, kFlags = 0x3F;
    const unsigned callers = _mm_getcsr();
    const bool differs = (callers & ~kFlags) != kDefault;
    if (differs) _mm_setcsr(kDefault);
    const QorResult result = detail::outOfLine(body);
    if (differs) _mm_setcsr(callers);
    return result;
}

}  // namespace qori::stats
