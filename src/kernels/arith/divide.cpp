// SPDX-License-Identifier: Apache-2.0
#include "divide.h"

namespace qori::kernels {
namespace {

/// A whole number q and a rest r / d of it, 0 <= r < d <= 2^63.
struct Mixed {
    uint64_t q, r, d;

    bool isAboveHalf() const { return 2 * r > d; }
    bool isHalf() const { return 2 * r == d; }
};

constexpr uint64_t kBeyondRange = uint64_t{1} << 32;

/// n / d * 2^-scale to the nearest integer, ties to even; anything from kBeyondRange on when it is there. n <= 2^63.
uint64_t roundedQuotient(uint64_t n, uint64_t d, int32_t scale) {
    Mixed m{n / d, n % d, d};
    if (scale > 0) {
        if (scale >= 64) return 0;  // at most 2^63 / 2^64
        const uint64_t whole = m.q >> scale, rest = m.q - (whole << scale), half = uint64_t{1} << (scale - 1);
        return whole + (rest > half || (rest == half && (m.r != 0 || whole % 2 == 1)));
    }
    // Long division, one bit for each power of two. n / d is at least 2^-63, so 96 bits are always enough.
    for (int bits = std::min(-std::max(scale, -96), 96); bits > 0; --bits) {
        if (m.q >= kBeyondRange) return m.q;
        m.r *= 2;
        const bool one = m.r >= d;
        if (one) m.r -= d;
        m.q = 2 * m.q + one;
    }
    return m.q + (m.isAboveHalf() || (m.isHalf() && m.q % 2 == 1));
}

int32_t saturate(bool negative, uint64_t magnitude) {
    const uint64_t most = uint64_t{INT32_MAX} + negative;
    if (magnitude > most) magnitude = most;
    return static_cast<int32_t>(negative ? -static_cast<int64_t>(magnitude) : static_cast<int64_t>(magnitude));
}

/// The sum as 64 bits that wrap: INT64_MIN stands for 2^63, which only four times -2^31 makes; -2^63 cannot occur.
int32_t roundedPart(uint64_t wrapped, uint64_t norm, int32_t scale) {
    const bool negative = wrapped > uint64_t{1} << 63;
    return saturate(negative, roundedQuotient(negative ? 0 - wrapped : wrapped, norm, scale));
}

int32_t limitBySign(int32_t v) { return v > 0 ? INT32_MAX : v < 0 ? INT32_MIN : 0; }

}  // namespace

QorComplex32s divideExactly(QorComplex32s divisor, QorComplex32s numerator, int32_t scale) {
    const auto product = [](int32_t x, int32_t y) { return static_cast<uint64_t>(int64_t{x} * y); };
    const auto [a, b] = divisor;
    const auto [c, d] = numerator;
    const uint64_t norm = product(a, a) + product(b, b);
    if (norm == 0) return {limitBySign(c), limitBySign(d)};
    return {roundedPart(product(c, a) + product(d, b), norm, scale),
            roundedPart(product(d, a) - product(c, b), norm, scale)};
}

}  // namespace qori::kernels
