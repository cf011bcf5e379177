// SPDX-License-Identifier: Apache-2.0
// Roots of unity in double precision, for tables that are rounded to float. No library function is called: both systems
// make the same tables.
#pragma once
#include <cstdint>

#include "kernels/simd.h"

namespace qori::kernels {

/// A complex number of a table.
struct Root {
    double re, im;
};

constexpr Root operator*(Root a, Root b) { return {a.re * b.re - a.im * b.im, a.re * b.im + a.im * b.re}; }

/// e^(-2 pi i j / n) for 0 <= j < n < 2^60, each part to 2^-52.
Root rootOfUnity(int64_t j, int64_t n);

/// The same of one n, for any j, by a product of two of about 2 sqrt(n) roots in memory; to 2^-51. Without memory each
/// root is made anew.
class Roots {
public:
    /// Bytes of memory, aligned to 8.
    static int64_t bytes(int64_t n) { return (steps(n) + n / steps(n) + 1) * static_cast<int64_t>(sizeof(Root)); }

    Roots(int64_t n, void* memory);
    Root operator()(int64_t j) const {
        j %= n_;
        if (fine_ == nullptr) return rootOfUnity(j, n_);
        return coarse_[j / steps_] * fine_[j % steps_];
    }

private:
    static int64_t steps(int64_t n) {
        int64_t root = 1;
        while (root * root < n) root *= 2;
        return root;
    }
    int64_t n_, steps_;
    Root *fine_ = nullptr, *coarse_ = nullptr;
};

}  // namespace qori::kernels
