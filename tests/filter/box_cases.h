// SPDX-License-Identifier: Apache-2.0
// Masks, sources and references that the tests of both generations of the box filter share.
#pragma once
#include <vector>

#include "harness/window.h"
#include "reference/box.h"

namespace qori::test {

/// Masks on all sides of the changes of kernel: by width (added up or running, chains of one pass and of several), by
/// height (single rows, blocks), by area (sums of 16 and 32 bits).
inline const std::vector<QorImageSize>& boxMasks() {
    static const std::vector<QorImageSize> masks = {
        {3, 3},   {5, 5},  {7, 7}, {1, 1},  {2, 2},  {4, 4},  {6, 3},  {8, 8},  {9, 2},  {15, 15}, {16, 16},
        {17, 16}, {1, 5},  {5, 1}, {3, 40}, {7, 36}, {7, 37}, {40, 3}, {61, 2}, {12, 9}, {2, 129}, {1, 20},
        {13, 1},  {33, 8}, {4, 7}, {10, 9}, {3, 2},  {2, 3},  {31, 5}, {75, 1}, {1, 2},  {2, 1},   {3, 128}};
    return masks;
}

/// Any integers; floats that are integers, whose sums are exact under 2^24.
template <class T>
T drawExact() {
    if constexpr (std::is_floating_point_v<T>)
        return static_cast<T>(random().below(8001) - 4000);
    else
        return random().value<T>();
}

/// The mean of what pixel(i, j) gives for the columns i and rows j of a mask.
template <class T, class Fetch>
T boxMean(QorImageSize mask, Fetch pixel) {
    reference::WindowSum<T> sum;
    for (int j = 0; j < mask.height; ++j)
        for (int i = 0; i < mask.width; ++i) sum.add(pixel(i, j));
    const int64_t area = int64_t{mask.width} * mask.height;
    if constexpr (std::is_floating_point_v<T>)
        return static_cast<T>(sum.value) / static_cast<T>(mask.width * mask.height);
    else
        return reference::meanOf<T>(sum.value, area);
}

/// How far sums of floats may be off for the most additions that an element goes through.
template <class T>
constexpr double kUnit = std::numeric_limits<T>::epsilon() / 2;

}  // namespace qori::test
