// SPDX-License-Identifier: Apache-2.0
// Medians of 5 x 5 windows. Every source row's quintuples are put in order once. Windows of two rows, an even one and
// the one below, share four source rows: these are merged once for both, by twos, and each two serve two such pairs.
// Of the 20 only the ranks that a fifth row can leave the median in are kept, six of them.
#pragma once
#include "windows.h"

namespace qori::kernels {
namespace detail {

/// Where the strips of a row begin: vectors that are worked on together, whose rows in order fit the first cache.
constexpr int kStripVectors = 32;

/// What strips keep from one pair of destination rows to the next, per vector.
template <class K>
struct Square5State {
    Vec<K> even[2][5];  ///< Source rows 0 and 2 behind the pair's first, in turn.
    Vec<K> odd[5];      ///< The third behind it.
    Vec<K> pair[10];    ///< The first and second behind it, merged.
};

template <class T, class Count>
QORI_INLINE void quintuple(const T* p, ptrdiff_t apart, Count count, Vec<Key<T>>* to) {
    for (int i = 0; i < 5; ++i) to[i] = loadKeys(p + i * apart, count);
    sort5(to);
}

/// Of two ascending runs of ten, the elements of ranks 7 to 12 (from 0), ascending. The smaller ones of a[i] and
/// b[9 - i] are the ten smallest of all, in a sequence that rises and falls once; of those, five apart, the larger
/// ones are the five largest.
template <class K>
QORI_INLINE void middleSix(const Vec<K>* a, const Vec<K>* b, Vec<K>* to) {
    Vec<K> low[5], high[5];
    for (int i = 0; i < 5; ++i) {
        low[i] = upper(lower(a[i], b[9 - i]), lower(a[i + 5], b[4 - i]));
        high[4 - i] = lower(upper(a[i], b[9 - i]), upper(a[i + 5], b[4 - i]));
    }
    // The three largest of the five, which the seven comparators find in what such sequences leave; mirrored, the
    // three smallest.
    order(low[0], low[1]), order(low[0], low[2]);
    low[3] = upper(low[0], low[3]);
    order(low[1], low[3]), order(low[2], low[4]);
    low[2] = upper(low[1], low[2]);
    order(low[3], low[4]);
    order(high[1], high[0]), order(high[2], high[0]);
    high[3] = lower(high[0], high[3]);
    order(high[3], high[1]), order(high[4], high[2]);
    high[2] = lower(high[1], high[2]);
    order(high[4], high[3]);
    for (int i = 0; i < 3; ++i) to[i] = low[2 + i], to[3 + i] = high[4 - i];
}

/// The sixth of the eleven elements of two ascending runs: it is the smallest of the larger ones of c[i] and the
/// element of d that makes six together with it and what comes before it.
template <class K>
QORI_INLINE Vec<K> middleOf11(const Vec<K>* d, const Vec<K>* c) {
    Vec<K> result = d[5];
    for (int i = 0; i < 5; ++i) result = lower(result, upper(c[i], d[4 - i]));
    return result;
}

template <class T, class Count>
QORI_INLINE void beginSquare5(const T* const* src, ptrdiff_t at, ptrdiff_t apart, Count count,
                              Square5State<Key<T>>& state) {
    Vec<Key<T>> first[5], second[5];
    quintuple(src[0] + at, apart, count, state.even[0]);
    quintuple(src[1] + at, apart, count, first);
    quintuple(src[2] + at, apart, count, second);
    quintuple(src[3] + at, apart, count, state.odd);
    for (int i = 0; i < 5; ++i) state.even[1][i] = second[i];
    merge5(first, second, state.pair);
}

/// Rows y and, unless it is the last one, y + 1, at one vector.
template <bool both, bool keepAlpha, class T, class Count>
QORI_INLINE void makeSquare5(const T* const* src, T* const* dst, ptrdiff_t at, ptrdiff_t apart, Count count,
                             bool prefetches, Vec<Key<T>> (&oldest)[5], Square5State<Key<T>>& state) {
    using K = Key<T>;
    Vec<K> four[6], next[5], pair[10];
    quintuple(src[4] + at, apart, count, next);
    merge5(state.odd, next, pair);
    middleSix(state.pair, pair, four);
    storeElements<keepAlpha>(dst[0] + at, elementsOf<T>(middleOf11(four, oldest)), count);
    if constexpr (both) {
        if (prefetches) {  // strips are too short for the processor to see ahead
            for (int k = 0; k < 2; ++k) __builtin_prefetch(src[6 + k] + at), __builtin_prefetch(dst[2 + k] + at, 1);
        }
        for (int i = 0; i < 5; ++i) oldest[i] = next[i];
        for (int i = 0; i < 10; ++i) state.pair[i] = pair[i];
        quintuple(src[5] + at, apart, count, next);
        for (int i = 0; i < 5; ++i) state.odd[i] = next[i];
        storeElements<keepAlpha>(dst[1] + at, elementsOf<T>(middleOf11(four, next)), count);
    }
}

}  // namespace detail

/// `rows` destination rows from rows + 4 source rows, each given by the leftmost element of its first window;
/// neighbours are `apart` elements away.
template <bool keepAlpha, class T>
QORI_NOINLINE void medianSquare5(const T* const* src, T* const* dst, int rows, ptrdiff_t elements, ptrdiff_t apart) {
    constexpr ptrdiff_t n = Vec<T>::lanes;
    const std::integral_constant<ptrdiff_t, n> whole;
    detail::Square5State<Key<T>> states[detail::kStripVectors];
    const auto strip = [&](ptrdiff_t begin, ptrdiff_t end, auto count) __attribute__((always_inline)) {
        const auto forVectors = [&](auto make) __attribute__((always_inline)) {
            if constexpr (std::is_same_v<decltype(count), ptrdiff_t>) return make(begin, states[0]);
            auto* state = states;
            for (ptrdiff_t at = begin; at < end; at += n) make(std::min(at, end - n), *state++);
        };
        forVectors([&](ptrdiff_t at, auto& state)
                       __attribute__((always_inline)) { detail::beginSquare5(src, at, apart, count, state); });
        for (int y = 0; y < rows; y += 2)
            forVectors([&](ptrdiff_t at, auto& state) __attribute__((always_inline)) {
                auto& oldest = state.even[y / 2 % 2];
                if (y + 1 < rows)
                    detail::makeSquare5<true, keepAlpha>(src + y, dst + y, at, apart, count, y + 4 <= rows, oldest,
                                                         state);
                else
                    detail::makeSquare5<false, keepAlpha>(src + y, dst + y, at, apart, count, y + 4 <= rows, oldest,
                                                          state);
            });
    };
    if (elements < n) return strip(0, elements, elements);
    constexpr ptrdiff_t width = detail::kStripVectors * n;
    for (ptrdiff_t begin = 0; begin < elements;) {
        // The last strip takes what is left from a whole vector on, so that its last vector may overlap.
        const ptrdiff_t left = elements - begin,
                        end = left <= width ? elements : begin + (left < width + n ? width - n : width);
        strip(begin, end, whole);
        begin = end;
    }
}

#define QORI_SQUARES5(how, T) \
    how template void medianSquare5<false>(const T* const*, T* const*, int, ptrdiff_t, ptrdiff_t);
#define QORI_SQUARES5_WITH_ALPHA(how, T) \
    how template void medianSquare5<true>(const T* const*, T* const*, int, ptrdiff_t, ptrdiff_t);
#define QORI_ALL_SQUARES5(how)              \
    QORI_SQUARES5(how, uint8_t)             \
    QORI_SQUARES5(how, uint16_t)            \
    QORI_SQUARES5(how, int16_t)             \
    QORI_SQUARES5(how, float)               \
    QORI_SQUARES5(how, double)              \
    QORI_SQUARES5_WITH_ALPHA(how, uint8_t)  \
    QORI_SQUARES5_WITH_ALPHA(how, uint16_t) \
    QORI_SQUARES5_WITH_ALPHA(how, int16_t)
QORI_ALL_SQUARES5(extern)

}  // namespace qori::kernels
