// SPDX-License-Identifier: Apache-2.0
// Merges as straight code, for those of square masks from 7 x 7 on, and what goes with them.
#pragma once
#include <array>
#include <utility>

#include "fixed_networks.h"
#include "order.h"

namespace qori::kernels::tiles {

template <int number>
inline constexpr FixedMergeList kFixedMergeLists{kFixedShapes.shape[number]};

template <int count>
using Count = std::make_integer_sequence<int, count>;

// What is done for each number of a sequence are functions of pointers, not lambdas, whose captures hide from the
// compiler for half of its time that arrays of vectors are registers.

template <int number, int place, class V>
QORI_INLINE V fromRuns(const V* first, const V* second) {
    constexpr MergeShape shape = kFixedMergeLists<number>.shape;
    return place < shape.first ? first[place] : second[place - shape.first];
}

template <int number, int i, class V>
QORI_INLINE void mergeStep(V* v, const V* first, const V* second, V* to) {
    constexpr FixedStep s = kFixedMergeLists<number>.step[i];
    if constexpr (s.readsLow) v[s.low] = fromRuns<number, s.low>(first, second);
    if constexpr (s.readsHigh) v[s.high] = fromRuns<number, s.high>(first, second);
    order(v[s.low], v[s.high]);
    if constexpr (s.rankOfLow >= 0) to[s.rankOfLow] = v[s.low];
    if constexpr (s.rankOfHigh >= 0) to[s.rankOfHigh] = v[s.high];
}
template <int number, int... i, class V>
QORI_INLINE void mergeSteps(std::integer_sequence<int, i...>, V* v, const V* first, const V* second, V* to) {
    (mergeStep<number, i>(v, first, second, to), ...);
}

template <int number, int rank, class V>
QORI_INLINE void copyUntouched(const V* first, const V* second, V* to) {
    constexpr int place = kFixedMergeLists<number>.untouched[rank];
    if constexpr (place >= 0) to[rank] = fromRuns<number, place>(first, second);
}
template <int number, int begin, int... i, class V>
QORI_INLINE void copyAllUntouched(std::integer_sequence<int, i...>, const V* first, const V* second, V* to) {
    (copyUntouched<number, begin + i>(first, second, to), ...);
}

template <int number, class V>
QORI_INLINE void mergeStraight(const V* first, const V* second, V* to) {
    constexpr MergeShape shape = kFixedMergeLists<number>.shape;
    constexpr int count = kFixedMergeLists<number>.count;
    V v[shape.first + shape.second];
    mergeSteps<number>(Count<count>{}, v, first, second, to);
    copyAllUntouched<number, shape.begin>(Count<shape.end - shape.begin>{}, first, second, to);
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

template <int n, int... i, class V>
QORI_INLINE void sortSteps(std::integer_sequence<int, i...>, V* v) {
    (order(v[kFixedSort<n>.list[i].low / kPlacesPerVector], v[kFixedSort<n>.list[i].high / kPlacesPerVector]), ...);
}

template <int... i, class V>
QORI_INLINE void copyAll(std::integer_sequence<int, i...>, const V* from, V* to) {
    ((to[i] = from[i]), ...);
}

/// Runs as long as those of square masks: up to eight elements.
template <int n, class V>
QORI_INLINE void sortStraight(V* a) {
    V v[n];
    copyAll(Count<n>{}, a, v);
    sortSteps<n>(Count<kFixedSort<n>.count>{}, v);
    copyAll(Count<n>{}, v, a);
}

template <int taken, int least, int... k, class V>
QORI_INLINE V selectSteps(std::integer_sequence<int, k...>, V result, const V* a, const V* b) {
    ((result = lower(result, upper(a[least + k - 1], b[taken - least - k - 1]))), ...);
    return result;
}

/// As selectOfTwo.
template <int aCount, int bCount, int rank, class V>
QORI_INLINE V selectStraight(const V* a, const V* b) {
    constexpr int taken = rank + 1, least = std::max(1, taken - bCount), most = std::min(aCount, taken - 1);
    V result = taken <= bCount ? b[taken - 1] : a[taken - 1];
    if constexpr (taken <= bCount && taken <= aCount) result = lower(result, a[taken - 1]);
    return selectSteps<taken, least>(Count<most - least + 1>{}, result, a, b);
}

template <class V>
using FixedMerge = void (*)(const V*, const V*, V*);

template <class V, int... number>
constexpr auto fixedMergesOf(std::integer_sequence<int, number...>) {
    return std::array<FixedMerge<V>, sizeof...(number)>{mergeOutOfLine<number, V>...};
}
template <class V>
inline constexpr auto kFixedMerges = fixedMergesOf<V>(Count<kFixedCount<V>>{});

}  // namespace qori::kernels::tiles
