// SPDX-License-Identifier: Apache-2.0
// What the tests of medians share.
#pragma once
#include <cmath>

#include "harness/window.h"
#include "reference/median.h"

namespace qori::test {

/// Any value but a signalling NaN, which 32-bit functions make quiet when they return it.
template <class T>
T drawQuiet() {
    const T value = random().value<T>();
    if constexpr (std::is_floating_point_v<T>)
        return std::isnan(value) ? value + value : value;
    else
        return value;
}

/// One image in three of any values, one of two neighbours of each other and of zero, one that grows slowly: bins of
/// every kind of histogram get to hold many and few.
template <class T>
struct MedianValues {
    int kind = random().below(3);
    mutable int32_t level = random().below(1 << 20);

    T operator()() const {
        if (kind == 0) return drawQuiet<T>();
        if (kind == 1) return static_cast<T>(random().below(3));
        level += random().below(64) - 30;
        if constexpr (std::is_floating_point_v<T>)
            return static_cast<T>(level) / T(1024);
        else
            return static_cast<T>(level >> (sizeof(T) == 1 ? 4 : 2));
    }
};

/// The median of the pixels that a window sees: pixel(dx, dy) around its own.
template <class Pixel>
auto medianAround(Around around, Pixel pixel) {
    std::vector<decltype(pixel(0, 0))> elements;
    elements.reserve(static_cast<size_t>((around.left + around.right + 1) * (around.top + around.bottom + 1)));
    for (int dy = -around.top; dy <= around.bottom; ++dy)
        for (int dx = -around.left; dx <= around.right; ++dx) elements.push_back(pixel(dx, dy));
    return reference::median(elements);
}

}  // namespace qori::test
