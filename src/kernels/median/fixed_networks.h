// SPDX-License-Identifier: Apache-2.0
// Which comparators a merge of known lengths takes, and in which order they run best as straight code.
#pragma once
#include "tile_shapes.h"

namespace qori::kernels::tiles {

/// Comparators that merge two runs, the places of the second behind those of the first.
struct MergeNetwork {
    static constexpr int kMost = 5 * kLongestFixed;

    Comparator list[kMost]{};
    int count = 0;
    int16_t place[kLongestFixed]{};  ///< Where the element of a rank ends, of those that are asked for.

    constexpr void add(int32_t low, int32_t high) { list[count++] = comparators::between(low, high); }
    static constexpr int placeOf(const Comparator& c, int side) {
        return (side == 0 ? c.low : c.high) / kPlacesPerVector;
    }

    /// Minima and maxima that somebody asks for.
    constexpr int cost(const MergeShape& s) const {
        bool live[kLongestFixed]{};
        for (int32_t rank = s.begin; rank < s.end; ++rank) live[place[rank]] = true;
        int all = 0;
        for (int i = count - 1; i >= 0; --i) {
            bool &low = live[placeOf(list[i], 0)], &high = live[placeOf(list[i], 1)];
            all += low + high;
            low = high = low || high;
        }
        return all;
    }
};

/// Batcher's odd-even merge.
constexpr MergeNetwork oddEvenMerge(const MergeShape& s) {
    MergeNetwork made;
    Merge merge;
    merge.first = s.first, merge.second = s.second, merge.begin = s.begin, merge.end = s.end;
    comparators::pairRuns(merge);
    for (int32_t i = 0; i < merge.paired; ++i) made.add(i, merge.first + merge.skipped + i);
    merge.rest.list = made.list + made.count;
    comparators::listSteps(merge);
    made.count += merge.rest.count;
    for (int32_t i = 0; i < merge.length(); ++i) made.place[i] = static_cast<int16_t>(i);
    return made;
}

/// A single element passes all that are not above it.
constexpr MergeNetwork insertion(const MergeShape& s) {
    MergeNetwork made;
    for (int32_t i = 0; i < s.first; ++i) made.add(i, s.first);
    for (int32_t i = 0; i <= s.first; ++i) made.place[i] = static_cast<int16_t>(i);
    return made;
}

/// Elements that a trimmed merge drops from either end, or 0 where it is none: a power of two of them must be left.
constexpr int32_t trimmedOf(const MergeShape& s) {
    int32_t kept = 1;
    while (kept < s.end - s.begin) kept *= 2;
    const int32_t all = s.first + s.second, dropped = (all - kept) / 2;
    const bool fits = kept < all && (all - kept) % 2 == 0 && 2 * dropped <= s.first && dropped <= s.second;
    return fits && dropped <= s.begin && dropped <= all - s.end ? dropped : 0;
}

/// What cannot be among the ranks asked for is dropped first. The smallest n of all are the minima of the first run's
/// n smallest, ascending, with the second's n smallest, descending; so for the largest. Behind what is left of the
/// first run, the second one backwards then goes on rising, falls, and rises to where the first begins: a bitonic
/// sequence, for Batcher's other merge.
constexpr MergeNetwork trimmedMerge(const MergeShape& s) {
    MergeNetwork made;
    const int32_t n = trimmedOf(s), kept = s.first + s.second - 2 * n;
    for (int32_t i = 0; i < n; ++i) made.add(n - 1 - i, s.first + i);
    for (int32_t i = 0; i < n; ++i) made.add(s.first + s.second - n + i, s.first - 1 - i);
    for (int32_t i = 0; i < kept; ++i) {
        const int32_t ofFirst = s.first - 2 * n;
        made.place[n + i] = static_cast<int16_t>(i < ofFirst ? n + i : s.first + s.second - 1 - (i - ofFirst));
    }
    for (int32_t apart = kept / 2; apart > 0; apart /= 2)
        for (int32_t i = 0; i < kept; ++i)
            if ((i & apart) == 0) made.add(made.place[n + i], made.place[n + i + apart]);
    return made;
}

constexpr MergeNetwork cheapestMerge(const MergeShape& s) {
    if (s.second == 1) return insertion(s);
    const MergeNetwork merge = oddEvenMerge(s);
    if (trimmedOf(s) == 0) return merge;
    const MergeNetwork other = trimmedMerge(s);
    return other.cost(s) < merge.cost(s) ? other : merge;
}

/// A comparator: whether its elements are read from the runs, and the ranks of those that it completes, or -1.
struct FixedStep {
    int16_t low, high;
    bool readsLow, readsHigh;
    int16_t rankOfLow, rankOfHigh;
};

/// The comparators of a merge in the order in which its elements, from the lowest up, ask for them. Merges go from far
/// pairs to near ones or back: run step by step, every element waits in memory for the next step, two stores for each
/// comparator, and those bind. Depth first, 15 x 15 takes half the loads and stores with 15 registers, less with seven.
struct FixedMergeList {
    MergeShape shape;
    int count = 0;
    FixedStep step[MergeNetwork::kMost]{};
    int16_t untouched[kLongestFixed]{};  ///< The place of a rank that no comparator completes, or -1.

    constexpr explicit FixedMergeList(const MergeShape& s) : shape(s) {
        const MergeNetwork merge = cheapestMerge(s);
        Asked asked{merge.list, {}, {}, {}};
        int16_t last[kLongestFixed]{};  // numbers of comparators count from 1
        for (int i = 0; i < merge.count; ++i)
            for (int side = 0; side < 2; ++side) {
                int16_t& at = last[MergeNetwork::placeOf(merge.list[i], side)];
                asked.before[i][side] = at;
                at = static_cast<int16_t>(i + 1);
            }
        for (int32_t rank = 0; rank < s.first + s.second; ++rank) {
            const bool isAsked = s.begin <= rank && rank < s.end;
            const int16_t place = isAsked ? merge.place[rank] : int16_t{-1};
            untouched[rank] = isAsked && last[place] == 0 ? place : int16_t{-1};
            if (isAsked && last[place] != 0)
                asked.rank[last[place] - 1][MergeNetwork::placeOf(merge.list[last[place] - 1], 1) == place] =
                    static_cast<int16_t>(rank + 1);
        }
        for (int32_t rank = s.begin; rank < s.end; ++rank) visit(asked, last[merge.place[rank]]);
    }

private:
    struct Asked {
        const Comparator* list;
        int16_t before[MergeNetwork::kMost][2];  ///< The comparators whose elements one takes, or 0.
        int16_t rank[MergeNetwork::kMost][2];    ///< Ranks from 1 of what it completes, or 0.
        bool isDone[MergeNetwork::kMost];
    };

    constexpr void visit(Asked& asked, int16_t number) {
        if (number == 0 || asked.isDone[number - 1]) return;
        const int i = number - 1;
        asked.isDone[i] = true;
        for (const int16_t before : asked.before[i]) visit(asked, before);
        step[count++] = {static_cast<int16_t>(MergeNetwork::placeOf(asked.list[i], 0)),
                         static_cast<int16_t>(MergeNetwork::placeOf(asked.list[i], 1)),
                         asked.before[i][0] == 0,
                         asked.before[i][1] == 0,
                         static_cast<int16_t>(asked.rank[i][0] - 1),
                         static_cast<int16_t>(asked.rank[i][1] - 1)};
    }
};

}  // namespace qori::kernels::tiles
