// SPDX-License-Identifier: Apache-2.0
// What lanes are emptied into, and its double. A region has up to (2^31 - 1)^2 < 2^62 pixels, so an integer total takes
// up to 62 bits more than its terms: 8-bit sums 70, 16-bit sums and 8-bit products 78, 16-bit products 94.
#pragma once
#include <cstdint>

#include "kernels/simd.h"

namespace qori::kernels {

/// Rounded once. The words are converted apart, as there is no 64-bit conversion on 32-bit targets.
QORI_INLINE double toDouble(uint64_t value) {
    return static_cast<double>(static_cast<uint32_t>(value >> 32)) * 4'294'967'296.0 +
           static_cast<double>(static_cast<uint32_t>(value));
}
template <class T>
QORI_INLINE double toDouble(T value) {
    return static_cast<double>(value);
}

/// A sum of 64-bit integers in 128 bits.
class WideTotal {
public:
    void add(uint64_t value) {
        low_ += value;
        high_ += low_ < value;
    }
    void add(int64_t value) {
        add(static_cast<uint64_t>(value));
        high_ -= value < 0;
    }

    /// Rounded once.
    double rounded() const {
        const bool negative = high_ >> 63;
        const uint64_t low = negative ? 0 - low_ : low_, high = negative ? ~high_ + (low_ == 0) : high_;
        const double magnitude = high == 0 ? toDouble(low) : roundedBeyond64(low, high);
        return negative ? -magnitude : magnitude;
    }
    /// Of a total that is not negative.
    int32_t saturated() const { return high_ != 0 || low_ > INT32_MAX ? INT32_MAX : static_cast<int32_t>(low_); }

private:
    /// The upper 64 bits from the first set one on, the last of them also set if any bit below is: it lies ten bits
    /// below the last that a double keeps, and rounding looks no further than whether there is anything.
    static double roundedBeyond64(uint64_t low, uint64_t high) {
        const int shift = 64 - __builtin_clzll(high);
        if (shift == 64) return toDouble(high | (low != 0)) * 0x1p64;
        const uint64_t upper = high << (64 - shift) | low >> shift, below = low << (64 - shift);
        return toDouble(upper | (below != 0)) * toDouble(uint64_t{1} << shift);
    }

    uint64_t low_ = 0, high_ = 0;  ///< In two's complement.
};

QORI_INLINE double toDouble(const WideTotal& total) { return total.rounded(); }

}  // namespace qori::kernels
