// SPDX-License-Identifier: Apache-2.0
// Sorting and merging networks of any length as lists of comparators, made when the length is known: Batcher's odd-even
// merge. What runs them holds no comparison of its own, so that one loop serves every length and every type.
#pragma once
#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace qori::kernels {

/// Puts the elements at two places in order. Places are counted in quarters of a vector, which addresses scale by 8.
struct Comparator {
    uint16_t low, high;
};
inline constexpr int kPlacesPerVector = 4;

/// In the order in which they are run.
struct Comparators {
    Comparator* list = nullptr;
    int32_t count = 0;
};

/// Two ascending runs of `first` and `second` elements become one, of which the elements of ranks from `begin` on and
/// before `end` (from 0) are asked for: those before and behind are in any order. The first step reads the runs where
/// they are: element i + skipped of the second is put in order with element i of the first, for `paired` elements; what
/// else there is comes along as it is. All other steps are comparators in place.
struct Merge {
    int32_t first = 0, second = 0, begin = 0, end = 0;
    int32_t paired = 0, skipped = 0;
    Comparators rest;
    int fixed = -1;  ///< Its number among the merges that have code of their own.

    constexpr int32_t length() const { return first + second; }
};

namespace comparators {

/// Elements that a merge puts together, and a sort in order, at most.
inline constexpr int32_t kMost = 4096;

constexpr int32_t log2Above(int32_t n) {
    int32_t bits = 0;
    while ((int64_t{1} << bits) < n) ++bits;
    return bits;
}

constexpr Comparator between(int32_t low, int32_t high) {
    return {static_cast<uint16_t>(low * kPlacesPerVector), static_cast<uint16_t>(high * kPlacesPerVector)};
}

/// Leaves out what no live place hears of, from the end; what lives is then what the elements before are needed for.
constexpr void keepLive(Comparators& all, uint8_t* live) {
    int32_t to = all.count;
    for (int32_t from = all.count - 1; from >= 0; --from) {
        const Comparator c = all.list[from];
        uint8_t &low = live[c.low / kPlacesPerVector], &high = live[c.high / kPlacesPerVector];
        if ((low | high) == 0) continue;
        low = high = 1;
        all.list[--to] = c;
    }
    for (int32_t i = to; i < all.count; ++i) all.list[i - to] = all.list[i];
    all.count -= to;
}

/// Comparators that n elements take at most, to be sorted or merged.
constexpr int64_t mostToSort(int32_t n) {
    const int32_t rounds = log2Above(n);
    return int64_t{n / 2} * (rounds * (rounds + 1) / 2);
}

constexpr int64_t mostToMerge(int32_t first, int32_t second) {
    return int64_t{(first + second) / 2} * log2Above(std::max(first, second));
}

/// Knuth, The Art of Computer Programming, volume 3, 5.2.2, algorithm M.
constexpr void makeSort(int32_t n, Comparators& sort) {
    sort.count = 0;
    const int32_t top = n < 2 ? 0 : 1 << (log2Above(n) - 1);
    for (int32_t p = top; p > 0; p /= 2)
        for (int32_t q = top, r = 0, d = p;;) {
            for (int32_t i = 0; i < n - d; ++i)
                if ((i & p) == r) sort.list[sort.count++] = between(i, i + d);
            if (q == p) break;
            d = q - p, q /= 2, r = p;
        }
}

/// Of the halves of a merge, which are as long as its longer run rounded up to a power of two.
constexpr int32_t halfOf(const Merge& merge) { return 1 << log2Above(std::max(merge.first, merge.second)); }

/// The first step.
constexpr void pairRuns(Merge& merge) {
    const int32_t size = halfOf(merge);
    merge.paired = std::max(0, merge.length() - size);
    merge.skipped = std::min(size - merge.first, merge.second);
}

/// The other steps. Both runs as halves of 2 * size places, the first one behind places of the smallest of all, the
/// second one before places of the largest: comparators with such a place change nothing and are left out, whence any
/// length.
constexpr void listSteps(Merge& merge) {
    const int32_t size = halfOf(merge), before = size - merge.first, end = size + merge.second;
    merge.rest.count = 0;
    for (int32_t d = size / 2; d >= 1; d /= 2)
        for (int32_t block = d; block < 2 * size - d; block += 2 * d)
            for (int32_t i = std::max(block, before); i < std::min(block + d, end - d); ++i)
                merge.rest.list[merge.rest.count++] = between(i - before, i + d - before);
    uint8_t live[kMost];
    for (int32_t i = 0; i < merge.length(); ++i) live[i] = merge.begin <= i && i < merge.end;
    keepLive(merge.rest, live);
}

}  // namespace comparators
}  // namespace qori::kernels
