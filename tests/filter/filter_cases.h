// SPDX-License-Identifier: Apache-2.0
// Kernels, sources and expected pixels that the tests of the general linear filters share.
#pragma once
#include <string>

#include "harness/sweep.h"
#include "reference/filter.h"

namespace qori::test {

using reference::Kernel;

enum Slot { kSrc, kDst, kPlan, kBuffer, kOther };

/// How large coefficients are: ties and exact sums, sums beyond every shortcut, the ends of the type.
enum class Coefficients { small, medium, large };

template <class K>
K drawCoefficient(Coefficients size) {
    const int sign = random().oneIn(2) ? 1 : -1;
    if constexpr (std::is_floating_point_v<K>) {
        if (size == Coefficients::small) return static_cast<K>(random().below(257) - 128) / 8;
        const K x = static_cast<K>(random().below(1 << 24)) / (1 << 24);
        return static_cast<K>(sign) * (size == Coefficients::medium ? x : x * x * 1000);
    } else {
        if (size == Coefficients::small) return static_cast<K>(sign * random().below(9));
        if (size == Coefficients::medium) return static_cast<K>(sign * random().below(1500));
        return random().value<K>();
    }
}

/// Widths of a sweep: every one to beyond two vectors of bytes, then those around larger ones and any up to 600.
inline int sweptWidth(int turn) {
    constexpr int kEvery = 70;
    static constexpr int further[] = {95, 96, 97, 127, 128, 129, 257};
    if (turn < kEvery) return turn + 1;
    turn -= kEvery;
    return turn < static_cast<int>(std::size(further)) ? further[turn] : 200 + random().below(400);
}

inline Coefficients drawSize() { return static_cast<Coefficients>(random().below(3)); }

template <class K>
Kernel<K> drawKernel(Coefficients size, int most = 9) {
    static constexpr int common[] = {1, 2, 3, 3, 5, 7, 4};
    const bool square = random().oneIn(2);
    const int width = square ? common[random().below(7)] : 1 + random().below(most);
    Kernel<K> kernel{width, square ? width : 1 + random().below(most), {}};
    for (int i = 0; i < kernel.width * kernel.height; ++i) kernel.values.push_back(drawCoefficient<K>(size));
    return kernel;
}

inline int32_t drawDivisor() {
    static constexpr int32_t divisors[] = {1,     1,       2,       4,         16,        256, 3,   9,     10,    -4,
                                           -1,    7,       25,      100,       6,         255, 300, 16384, 65535, 65536,
                                           65537, 1 << 24, 1 << 30, INT32_MIN, INT32_MAX, -10, 12,  1000};
    return divisors[random().below(static_cast<int>(std::size(divisors)))];
}

/// A sum of floats, or of integers as floats, in elements of `unit` relative rounding. Each of `taps` terms is rounded
/// at most `taps` times; sums of whole multiples of 1/8 below 2^20 are exact.
template <class D>
void expectFloatSum(reference::FloatSum sum, int taps, bool eighths, double unit, int32_t mode, D actual) {
    const bool exact = eighths && sum.magnitudes < (1 << 20);
    const long double error = exact ? 0 : sum.magnitudes * unit * (taps + 1);
    if constexpr (std::is_floating_point_v<D>) {
        EXPECT_LE(std::abs(actual - sum.value), error);
    } else {
        const auto ends = [&](long double x) { return reference::roundDouble(static_cast<double>(x), mode); };
        EXPECT_GE(actual, reference::clampTo<D>(ends(sum.value - error))) << static_cast<double>(sum.value);
        EXPECT_LE(actual, reference::clampTo<D>(ends(sum.value + error))) << static_cast<double>(sum.value);
    }
}

}  // namespace qori::test
