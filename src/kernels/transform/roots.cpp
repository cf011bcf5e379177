// SPDX-License-Identifier: Apache-2.0
#include "roots.h"

namespace qori::kernels {
namespace {

constexpr double kHalfPi = 1.57079632679489661923;

/// Taylor series for 0 <= x <= pi / 4: the terms left out are below 2^-60.
double sineOf(double x) {
    const double square = x * x;
    double sum = 1;
    for (int k = 16; k >= 2; k -= 2) sum = 1 - sum * square / (k * (k + 1));
    return x * sum;
}
double cosineOf(double x) {
    const double square = x * x;
    double sum = 1;
    for (int k = 17; k >= 1; k -= 2) sum = 1 - sum * square / (k * (k + 1));
    return sum;
}

}  // namespace

Root rootOfUnity(int64_t j, int64_t n) {
    // In quarters of a turn and what is left of one, exactly; beyond half of it the cosine and the sine change places.
    const int64_t quarters = 4 * j / n, rest = 4 * j - quarters * n;
    const bool isBeyond = 2 * rest > n;
    const double angle = static_cast<double>(isBeyond ? n - rest : rest) / static_cast<double>(n) * kHalfPi;
    const double s = sineOf(angle), c = cosineOf(angle);
    const double x = isBeyond ? s : c, y = isBeyond ? c : s;
    switch (quarters) {
        case 0: return {x, -y};
        case 1: return {-y, -x};
        case 2: return {-x, y};
        default: return {y, x};
    }
}

Roots::Roots(int64_t n, void* memory) : n_(n), steps_(steps(n)) {
    if (memory == nullptr) return;
    fine_ = static_cast<Root*>(memory);
    coarse_ = fine_ + steps_;
    for (int64_t i = 0; i < steps_; ++i) fine_[i] = rootOfUnity(i % n, n);
    for (int64_t i = 0; i <= n / steps_; ++i) coarse_[i] = rootOfUnity(i * steps_ % n, n);
}

}  // namespace qori::kernels
