// SPDX-License-Identifier: Apache-2.0
// Merges as straight code, for those that square masks of 7 x 7 to 15 x 15 spend most of their time in: all but halves
// the time of lists of comparators.
#pragma once
#include <array>
#include <utility>

#include "order.h"
#include "tile_shapes.h"

namespace qori::kernels::tiles {

struct FixedMergeList {
    Merge merge;
    Comparator list[4 * kLongestFixed];

    constexpr explicit FixedMergeList(const MergeShape& s) : merge{}, list{} {
        merge.first = s.first, merge.second = s.second, merge.begin = s.begin, merge.end = s.end;
        merge.rest.list = list;
        comparators::pairRuns(merge);
        comparators::listSteps(merge);
        merge.rest.list = nullptr;
    }
};
template <int number>
inline constexpr FixedMergeList kFixedMergeLists{kFixedShapes.shape[number]};

template <int number, class V>
QORI_NOINLINE void mergeFixed(const V* first, const V* second, V* to) {
    constexpr Merge merge = kFixedMergeLists<number>.merge;
    V v[merge.length()];
    const auto forEach = [](auto count, auto each) __attribute__((always_inline)) {
        [&]<int... i>(std::integer_sequence<int, i...>) __attribute__((always_inline)) {
            (each(std::integral_constant<int, i>{}), ...);
        }
        (std::make_integer_sequence<int, decltype(count)::value>{});
    };
    forEach(
        std::integral_constant<int, merge.length()>{}, [&](auto i) __attribute__((always_inline)) {
            v[i] = i < merge.first ? first[i] : second[i - merge.first];
        });
    forEach(
        std::integral_constant<int, merge.paired>{}, [&](auto i) __attribute__((always_inline)) {
            order(v[i], v[merge.first + merge.skipped + i]);
        });
    forEach(
        std::integral_constant<int, merge.rest.count>{}, [&](auto i) __attribute__((always_inline)) {
            constexpr Comparator c = kFixedMergeLists<number>.list[i];
            order(v[c.low / kPlacesPerVector], v[c.high / kPlacesPerVector]);
        });
    forEach(
        std::integral_constant<int, merge.end - merge.begin>{}, [&](auto i) __attribute__((always_inline)) {
            to[merge.begin + i] = v[merge.begin + i];
        });
}

template <class V>
using FixedMerge = void (*)(const V*, const V*, V*);

template <class V, int... number>
constexpr auto fixedMergesOf(std::integer_sequence<int, number...>) {
    return std::array<FixedMerge<V>, sizeof...(number)>{mergeFixed<number, V>...};
}
template <class V>
inline constexpr auto kFixedMerges = fixedMergesOf<V>(std::make_integer_sequence<int, kFixedShapes.count>{});

}  // namespace qori::kernels::tiles
