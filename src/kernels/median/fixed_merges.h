// SPDX-License-Identifier: Apache-2.0
// Merges as straight code, for those of square masks from 7 x 7 to 15 x 15, and what goes with them.
#pragma once
#include <array>
#include <utility>

#include "fixed_networks.h"
#include "order.h"

namespace qori::kernels::tiles {

template <int number>
inline constexpr FixedMergeList kFixedMergeLists{kFixedShapes.shape[number]};

/// each(0), each(1) ..., as constants.
template <int count, class Each>
QORI_INLINE void forEachOf(Each each) {
    [&]<int... i>(std::integer_sequence<int, i...>) __attribute__((always_inline)) {
        (each(std::integral_constant<int, i>{}), ...);
    }
    (std::make_integer_sequence<int, count>{});
}

template <int number, class V>
QORI_INLINE void mergeStraight(const V* first, const V* second, V* to) {
    constexpr const FixedMergeList& merge = kFixedMergeLists<number>;
    V v[merge.shape.first + merge.shape.second];
    const auto read = [=](int place) __attribute__((always_inline)) {
        return place < merge.shape.first ? first[place] : second[place - merge.shape.first];
    };
    forEachOf<merge.count>([&](auto i) __attribute__((always_inline)) {
        constexpr FixedStep s = merge.step[i];
        if constexpr (s.readsLow) v[s.low] = read(s.low);
        if constexpr (s.readsHigh) v[s.high] = read(s.high);
        order(v[s.low], v[s.high]);
        if constexpr (s.rankOfLow >= 0) to[s.rankOfLow] = v[s.low];
        if constexpr (s.rankOfHigh >= 0) to[s.rankOfHigh] = v[s.high];
    });
    forEachOf<merge.shape.end - merge.shape.begin>([&](auto i) __attribute__((always_inline)) {
        constexpr int rank = merge.shape.begin + i;
        if constexpr (merge.untouched[rank] >= 0) to[rank] = read(merge.untouched[rank]);
    });
}

template <int number, class V>
QORI_NOINLINE void mergeOutOfLine(const V* first, const V* second, V* to) {
    mergeStraight<number>(first, second, to);
}

/// Short ones where they stand.
template <int number, class V>
QORI_INLINE void mergeFixed(const V* first, const V* second, V* to) {
    constexpr int kMostInline = 32;
    if constexpr (kFixedMergeLists<number>.count <= kMostInline)
        mergeStraight<number>(first, second, to);
    else
        mergeOutOfLine<number>(first, second, to);
}

/// The number of a merge of all ranks.
template <int first, int second>
inline constexpr int kWholeMerge = numberOfFixed({first, second, 0, first + second});

template <int n>
struct FixedSortList {
    Comparator list[comparators::mostToSort(n)]{};
    int count = 0;

    constexpr FixedSortList() {
        Comparators sort{list, 0};
        comparators::makeSort(n, sort);
        count = sort.count;
    }
};
template <int n>
inline constexpr FixedSortList<n> kFixedSort{};

/// Runs as long as those of square masks: up to eight elements.
template <int n, class V>
QORI_INLINE void sortStraight(V* a) {
    V v[n];
    forEachOf<n>([&](auto i) __attribute__((always_inline)) { v[i] = {a[i].v}; });
    forEachOf<kFixedSort<n>.count>([&](auto i) __attribute__((always_inline)) {
        constexpr Comparator c = kFixedSort<n>.list[i];
        order(v[c.low / kPlacesPerVector], v[c.high / kPlacesPerVector]);
    });
    forEachOf<n>([&](auto i) __attribute__((always_inline)) { a[i].v = v[i].v; });
}

/// As selectOfTwo.
template <int aCount, int bCount, int rank, class V>
QORI_INLINE V selectStraight(const V* a, const V* b) {
    constexpr int taken = rank + 1, least = std::max(1, taken - bCount), most = std::min(aCount, taken - 1);
    V result = taken <= bCount ? b[taken - 1] : a[taken - 1];
    if constexpr (taken <= bCount && taken <= aCount) result = lower(result, a[taken - 1]);
    forEachOf<most - least + 1>([&](auto k) __attribute__((always_inline)) {
        constexpr int i = least + k;
        result = lower(result, upper(a[i - 1], b[taken - i - 1]));
    });
    return result;
}

template <class V>
using FixedMerge = void (*)(const V*, const V*, V*);

template <class V, int... number>
constexpr auto fixedMergesOf(std::integer_sequence<int, number...>) {
    return std::array<FixedMerge<V>, sizeof...(number)>{mergeOutOfLine<number, V>...};
}
template <class V>
inline constexpr auto kFixedMerges = fixedMergesOf<V>(std::make_integer_sequence<int, kFixedShapes.count>{});

}  // namespace qori::kernels::tiles
