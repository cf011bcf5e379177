// SPDX-License-Identifier: Apache-2.0
// Medians by their definition: all elements in order, and the one in the middle.
#pragma once
#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <type_traits>
#include <vector>

namespace qori::test::reference {

/// Integers as they are. Floats by sign, then by the magnitude of their bits: -0 before +0, NaNs at both ends.
template <class T>
bool comesBefore(T a, T b) {
    if constexpr (std::is_floating_point_v<T>) {
        using Word = std::conditional_t<sizeof(T) == 4, uint32_t, uint64_t>;
        if (std::signbit(a) != std::signbit(b)) return std::signbit(a);
        const auto magnitude = [](T x) { return static_cast<Word>(std::bit_cast<Word>(x) << 1); };
        return std::signbit(a) ? magnitude(a) > magnitude(b) : magnitude(a) < magnitude(b);
    } else {
        return a < b;
    }
}

/// An odd number of elements.
template <class T>
T median(std::vector<T>& elements) {
    const auto middle = elements.begin() + static_cast<std::ptrdiff_t>(elements.size() / 2);
    std::nth_element(elements.begin(), middle, elements.end(), [](T a, T b) { return comesBefore(a, b); });
    return *middle;
}

template <class T>
struct Colour {
    T channel[3];
};

/// The index of the pixel with the smallest sum of |dr| + |dg| + |db| to the others; of equal sums the first, and a sum
/// that is NaN is infinite. Float sums are added up in 32 bits, in order.
template <class T>
size_t colourMedian(const std::vector<Colour<T>>& pixels) {
    using Sum = std::conditional_t<std::is_floating_point_v<T>, float, int64_t>;
    size_t best = 0;
    Sum least{};
    for (size_t i = 0; i < pixels.size(); ++i) {
        Sum sum = 0;
        for (size_t j = 0; j < pixels.size(); ++j) {
            if (i == j) continue;
            const auto difference = [&](int c) {
                return static_cast<Sum>(std::abs(static_cast<Sum>(pixels[i].channel[c]) - pixels[j].channel[c]));
            };
            Sum distance = static_cast<Sum>(difference(0) + difference(1));
            distance = static_cast<Sum>(distance + difference(2));
            sum = static_cast<Sum>(sum + distance);
        }
        if constexpr (std::is_floating_point_v<T>)
            if (std::isnan(sum)) sum = INFINITY;
        if (i == 0 || sum < least) best = i, least = sum;
    }
    return best;
}

}  // namespace qori::test::reference
