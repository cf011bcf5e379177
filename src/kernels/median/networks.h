// SPDX-License-Identifier: Apache-2.0
// Sorting and selection by comparators whose order does not depend on the data, so that every lane is a pixel. A
// network that sorts all zeros and ones sorts everything.
#pragma once
#include "order.h"

namespace qori::kernels {

template <class K>
QORI_INLINE Vec<K> medianOf3(Vec<K> a, Vec<K> b, Vec<K> c) {
    order(a, b);
    return upper(a, lower(b, c));
}

/// 9 comparators.
template <class K>
QORI_INLINE void sort5(Vec<K>* a) {
    order(a[0], a[3]), order(a[1], a[4]);
    order(a[0], a[2]), order(a[1], a[3]);
    order(a[0], a[1]), order(a[2], a[4]);
    order(a[1], a[2]), order(a[3], a[4]);
    order(a[2], a[3]);
}

/// 19 comparators.
template <class K>
QORI_INLINE void sort8(Vec<K>* a) {
    order(a[0], a[2]), order(a[1], a[3]), order(a[4], a[6]), order(a[5], a[7]);
    order(a[0], a[4]), order(a[1], a[5]), order(a[2], a[6]), order(a[3], a[7]);
    order(a[0], a[1]), order(a[2], a[3]), order(a[4], a[5]), order(a[6], a[7]);
    order(a[2], a[4]), order(a[3], a[5]);
    order(a[1], a[4]), order(a[3], a[6]);
    order(a[1], a[2]), order(a[3], a[4]), order(a[5], a[6]);
}

/// The median of n elements, which it moves about.
template <int n, class K>
QORI_INLINE Vec<K> medianOf(Vec<K>* a) {
    static_assert(n == 1 || n == 3 || n == 5 || n == 9);
    if constexpr (n == 1) {
        return a[0];
    } else if constexpr (n == 3) {
        return medianOf3(a[0], a[1], a[2]);
    } else if constexpr (n == 5) {
        // Of two ordered pairs, neither the smaller of the minima nor the larger of the maxima is the median.
        order(a[0], a[1]), order(a[2], a[3]);
        return medianOf3(upper(a[0], a[2]), lower(a[1], a[3]), a[4]);
    } else {
        // Three ordered triples: the largest of the first, the middle of the second, the smallest of the last.
        for (int i = 0; i < 9; i += 3) order(a[i], a[i + 1]), order(a[i + 1], a[i + 2]), order(a[i], a[i + 1]);
        return medianOf3(upper(a[0], upper(a[3], a[6])), medianOf3(a[1], a[4], a[7]), lower(a[2], lower(a[5], a[8])));
    }
}

/// Two ascending runs of five become one of ten (odd-even merge, 13 comparators): to[0] ... to[9].
template <class K>
QORI_INLINE void merge5(const Vec<K>* a, const Vec<K>* b, Vec<K>* to) {
    // Even places 0 2 4 of both, and odd places 1 3 of both, each merged; then neighbours are put in order.
    Vec<K> e[6] = {a[0], a[2], a[4], b[0], b[2], b[4]}, o[4] = {a[1], a[3], b[1], b[3]};
    order(e[0], e[3]), order(e[1], e[4]), order(e[2], e[5]);  // 3 and 3: distance 3 ...
    order(e[2], e[4]), order(e[1], e[3]);                     // ... and what may still be crossed
    order(e[2], e[3]);
    order(o[0], o[2]), order(o[1], o[3]), order(o[1], o[2]);
    to[0] = e[0];
    for (int i = 0; i < 4; ++i) {
        to[2 * i + 1] = o[i];
        to[2 * i + 2] = e[i + 1];
        order(to[2 * i + 1], to[2 * i + 2]);
    }
    to[9] = e[5];
}

}  // namespace qori::kernels
