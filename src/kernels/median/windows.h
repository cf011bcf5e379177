// SPDX-License-Identifier: Apache-2.0
// Medians of small windows, element by element: a window is given by where its elements lie, so that channels, which
// are a distance between them, are of no concern. Destinations do not overlap sources: the last vector of a row ends
// with it and overlaps the one before.
#pragma once
#include "kernels/map.h"
#include "networks.h"

namespace qori::kernels {
namespace detail {

template <class T, class Count>
QORI_INLINE Vec<Key<T>> loadKeys(const T* p, Count count) {
    if constexpr (std::is_same_v<Count, ptrdiff_t>)
        return keysOf(loadPartial(p, count));
    else
        return keysOf(load(p));
}

template <bool keepAlpha, class T, class Count>
QORI_INLINE void storeElements(T* p, Vec<T> a, Count count) {
    constexpr bool part = std::is_same_v<Count, ptrdiff_t>;
    if constexpr (keepAlpha) {
        Vec<T> old;
        if constexpr (part)
            old = loadPartial(p, count);
        else
            old = load(p);
        a = withAlphaOf(a, old);
    }
    if constexpr (part)
        storePartial(p, a, count);
    else
        store(p, a);
}

/// Calls make(at, count) for each vector of a row: whole ones, or a single one of fewer elements.
template <class T, class Make>
QORI_INLINE void overlappingVectors(ptrdiff_t elements, Make make) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    const std::integral_constant<ptrdiff_t, n> whole;
    if (elements < n) return make(ptrdiff_t{0}, elements);
    ptrdiff_t at = 0;
    for (; at <= elements - n; at += n) make(at, whole);
    if (at < elements) make(elements - n, whole);
}

}  // namespace detail

/// dst[i] = median of src[0][i] ... src[n - 1][i].
template <int n, bool keepAlpha, class T>
QORI_NOINLINE void medianOfRows(const T* const* rows, T* dst, ptrdiff_t elements) {
    const T* src[n];
    for (int k = 0; k < n; ++k) src[k] = rows[k];
    detail::overlappingVectors<T>(
        elements, [=](ptrdiff_t at, auto count) __attribute__((always_inline)) {
            Vec<Key<T>> a[n];
            for (int k = 0; k < n; ++k) a[k] = detail::loadKeys(src[k] + at, count);
            detail::storeElements<keepAlpha>(dst + at, elementsOf<T>(medianOf<n>(a)), count);
        });
}

/// The median of src[0][i] ... src[7][i] and `weight` (1, 3, 5 or 7) times centre[i]: the centre where it lies between
/// the two of the eight that are median if it is very large or very small.
template <class T>
QORI_NOINLINE void medianAroundCentre(const T* const* rows, const T* centre, int weight, T* dst, ptrdiff_t elements) {
    const T* src[8];
    for (int k = 0; k < 8; ++k) src[k] = rows[k];
    const int highest = (weight + 7) / 2;
    detail::overlappingVectors<T>(
        elements, [=](ptrdiff_t at, auto count) __attribute__((always_inline)) {
            Vec<Key<T>> a[8];
            for (int k = 0; k < 8; ++k) a[k] = detail::loadKeys(src[k] + at, count);
            sort8(a);
            const Vec<Key<T>> middle = detail::loadKeys(centre + at, count);
            const Vec<Key<T>> result = upper(a[7 - highest], lower(middle, a[highest]));
            detail::storeElements<false>(dst + at, elementsOf<T>(result), count);
        });
}

/// 3 x 3: `rows` destination rows from rows + 2 source rows, each given by the left element of its first window;
/// neighbours are `apart` elements away. Every source row's triples are put in order once. Of three ordered triples
/// the median is that of the largest minimum, the middle median and the smallest maximum, and what these take of the
/// two triples that neighbouring rows share is formed once.
template <int rows, bool keepAlpha, class T>
QORI_NOINLINE void medianSquare3(const T* const* source, T* const* destination, ptrdiff_t elements, ptrdiff_t apart) {
    struct Triple {
        Vec<Key<T>> low, middle, high;
    };
    const T* src[rows + 2];
    T* dst[rows];
    for (int k = 0; k < rows + 2; ++k) src[k] = source[k];
    for (int k = 0; k < rows; ++k) dst[k] = destination[k];
    detail::overlappingVectors<T>(
        elements, [=](ptrdiff_t at, auto count) __attribute__((always_inline)) {
            const auto triple = [=](int row) __attribute__((always_inline)) {
                const T* const p = src[row] + at;
                Triple t{detail::loadKeys(p, count), detail::loadKeys(p + apart, count),
                         detail::loadKeys(p + 2 * apart, count)};
                order(t.low, t.middle), order(t.middle, t.high), order(t.low, t.middle);
                return t;
            };
            const auto finish = [=](int row, const Triple& shared, Vec<Key<T>> upperMiddle, const Triple& other)
                __attribute__((always_inline)) {
                const Vec<Key<T>> middle = upper(shared.middle, lower(upperMiddle, other.middle));
                const Vec<Key<T>> result =
                    medianOf3(upper(shared.low, other.low), middle, lower(shared.high, other.high));
                detail::storeElements<keepAlpha>(dst[row] + at, elementsOf<T>(result), count);
            };
            Triple first = triple(0);
            for (int k = 0; k < rows; k += 2) {
                const Triple second = triple(k + 1), third = triple(k + 2);
                const Triple shared{upper(second.low, third.low), lower(second.middle, third.middle),
                                    lower(second.high, third.high)};
                const Vec<Key<T>> upperMiddle = upper(second.middle, third.middle);
                finish(k, shared, upperMiddle, first);
                if (k + 1 == rows) break;
                finish(k + 1, shared, upperMiddle, triple(k + 3));
                first = third;
            }
        });
}

}  // namespace qori::kernels
