// SPDX-License-Identifier: Apache-2.0
#pragma once
#include <immintrin.h>

namespace qori::geometry {

/// Rounds to nearest, ties to even, whatever the caller's mode is, and gives the caller's control register back.
class RoundNearestScope {
public:
    RoundNearestScope() : before_(_mm_getcsr()) {
        constexpr unsigned kRounding = 0x6000, kDenormals = 0x8040;
        _mm_setcsr(before_ & ~(kRounding | kDenormals));
    }
    ~RoundNearestScope() { _mm_setcsr(before_); }
    RoundNearestScope(const RoundNearestScope&) = delete;
    RoundNearestScope& operator=(const RoundNearestScope&) = delete;

private:
    unsigned before_;
};

}  // namespace qori::geometry
