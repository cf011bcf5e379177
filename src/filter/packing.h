// SPDX-License-Identifier: Apache-2.0
// Kernels as the sums of kernels/filter_sums.h want them, and how large sums can become.
#pragma once
#include <algorithm>
#include <limits>

#include "frame/image.h"

namespace qori::filter {

/// Coefficients of 16 bits in pairs from the last to the first, the first of a pair in the low half, each pair
/// `repeats` times; a pair that ends an odd row holds one.
template <int repeats, class K>
void packPairs(const K* kernel, QorImageSize size, int32_t* packed) {
    for (int32_t j = size.height - 1; j >= 0; --j) {
        const K* const row = kernel + ptrdiff_t{j} * size.width;
        for (int32_t i = size.width - 1; i >= 0; i -= 2) {
            const auto first = static_cast<uint16_t>(row[i]), second = static_cast<uint16_t>(i > 0 ? row[i - 1] : K{0});
            packed = std::fill_n(packed, repeats, static_cast<int32_t>(first | static_cast<uint32_t>(second) << 16));
        }
    }
}

/// Coefficients from the last to the first, `repeats` times each.
template <int repeats, class C, class K>
void packTurned(const K* kernel, QorImageSize size, C* packed) {
    for (ptrdiff_t i = ptrdiff_t{size.width} * size.height; i-- > 0;)
        packed = std::fill_n(packed, repeats, static_cast<C>(kernel[i]));
}

/// The largest magnitude that a sum of T pixels can have: below 2^63 for kernels of 2^15 * 2^16 coefficients.
template <class T, class K>
int64_t largestSum(const K* kernel, QorImageSize size) {
    constexpr auto most = int64_t{std::numeric_limits<T>::max()}, least = int64_t{std::numeric_limits<T>::min()};
    constexpr int64_t kTooMuch = INT64_MAX / 2;
    int64_t high = 0, low = 0;
    for (ptrdiff_t i = 0; i < ptrdiff_t{size.width} * size.height; ++i) {
        const int64_t k = kernel[i];
        high += k > 0 ? k * most : k * least;
        low += k > 0 ? k * least : k * most;
        if (high > kTooMuch || -low > kTooMuch) return kTooMuch;
    }
    return std::max(high, -low);
}

}  // namespace qori::filter
