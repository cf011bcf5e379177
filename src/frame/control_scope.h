// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <immintrin.h>

namespace qori {

/// The floating-point control register at its default, round to nearest and no flushing of subnormals, until the end of
/// the scope; then as the caller had it.
class ControlScope {
public:
    ControlScope() : callers_(_mm_getcsr()) {
        constexpr unsigned standard = 0x1F80, flags = 0x3F;
        if ((callers_ & ~flags) != standard)
            _mm_setcsr(standard);
        else
            callers_ = kUnchanged;
    }
    ~ControlScope() {
        if (callers_ != kUnchanged) _mm_setcsr(callers_);
    }
    ControlScope(const ControlScope&) = delete;
    ControlScope& operator=(const ControlScope&) = delete;

private:
    static constexpr unsigned kUnchanged = ~0u;
    unsigned callers_;
};

}  // namespace qori
