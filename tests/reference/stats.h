// SPDX-License-Identifier: Apache-2.0
// The scalar truth of the statistics: one pixel at a time, one channel after the other.
#pragma once
#include <algorithm>
#include <cmath>
#include <type_traits>
#include <vector>

#include "harness/image.h"

namespace qori::test::reference {

/// A sum together with the sum of its terms' magnitudes, to which rounding errors are relative. Integer terms are
/// exact.
template <class T>
struct Sum {
    using Number = std::conditional_t<std::is_floating_point_v<T>, long double, int64_t>;
    Number total = 0, magnitude = 0;

    void add(Number term) {
        total += term;
        magnitude += term < 0 ? -term : term;
    }
};

/// Elements of one channel, row by row from the left.
template <class T>
std::vector<T> channel(View<T> image, QorImageSize roi, int c) {
    std::vector<T> elements;
    for (int y = 0; y < roi.height; ++y)
        for (int x = 0; x < roi.width; ++x) elements.push_back(image.get(x, y, c));
    return elements;
}

template <class T, class Term>
Sum<T> sumOf(const std::vector<T>& elements, Term term) {
    Sum<T> sum;
    for (size_t i = 0; i < elements.size(); ++i) sum.add(term(i));
    return sum;
}

template <class T>
T smallest(const std::vector<T>& elements) {
    return *std::min_element(elements.begin(), elements.end());
}
template <class T>
T largest(const std::vector<T>& elements) {
    return *std::max_element(elements.begin(), elements.end());
}

}  // namespace qori::test::reference
