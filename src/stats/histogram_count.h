// SPDX-License-Identifier: Apache-2.0
// Counts an image between levels. All ways give the same counts; which one is taken depends on the number of pixels and
// on the levels.
#pragma once
#include "image/driver.h"
#include "kernels/stats/histogram.h"
#include "kernels/stats/histogram_levels.h"

namespace qori::stats {

template <class T>
using Level = std::conditional_t<std::is_floating_point_v<T>, float, int32_t>;

template <class T>
constexpr int32_t kValues = 1 << 8 * sizeof(T);

template <class T>
constexpr int32_t kLowest = std::is_signed_v<T> ? -kValues<T> / 2 : 0;

/// One channel's levels and bins.
template <class L>
struct Channel {
    const L* levels;
    int32_t count;
    int32_t* bins;
};

// --- every value counted --------------------------------------------------------------------------------------------

/// Bytes: all 256 values are counted, then the levels are looked at.
template <Layout layout>
void countBytes(QorImageSize roi, Image<const uint8_t> src, const Channel<int32_t>* out) {
    constexpr int n = channels(layout), counted = processedChannels(layout);
    kernels::ByteCounters<n> counters;
    forEachRow(
        roi, [&](ptrdiff_t pixels, const uint8_t* row) { kernels::countBytesRow<n, counted>(counters, row, pixels); },
        walk(src, n));
    for (int c = 0; c < counted; ++c) {
        uint32_t table[256];
        counters.ofChannel(c, table);
        kernels::sumBins(table, 256, 0, out[c].levels, out[c].count, out[c].bins);
    }
}

/// 16 bits with room for a counter of every value.
template <class T, int n>
void countWords(QorImageSize roi, Image<const T> src, const Channel<int32_t>* out, uint32_t* table) {
    for (int32_t i = 0; i < n * kValues<T>; ++i) table[i] = 0;
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, const T* row) {
            kernels::countWordsRow<n>(table, reinterpret_cast<const uint16_t*>(row), pixels,
                                      std::is_signed_v<T> ? 0x8000 : 0);
        },
        walk(src, n));
    for (int c = 0; c < n; ++c)
        kernels::sumBins(table + c * kValues<T>, kValues<T>, kLowest<T>, out[c].levels, out[c].count, out[c].bins);
}

// --- elements placed among the levels -------------------------------------------------------------------------------

/// Copies `pixels` elements, `stored` apart, to a block; reads nothing else.
template <class T>
QORI_NOINLINE void copyChannel(const T* row, int pixels, int stored, T* block) {
    int x = 0;
    if (stored == 1) {
        constexpr int lanes = Vec<T>::lanes;
        for (; x <= pixels - lanes; x += lanes) store(block + x, load(row + x));
        if (x < pixels) storePartial(block + x, loadPartial(row + x, pixels - x), pixels - x);
    } else {
        for (; x < pixels; ++x) block[x] = row[ptrdiff_t{x} * stored];
    }
}

/// Calls take(block, n) with the elements of one channel; src starts at its first one. Rows that are shorter than a
/// block, and pixels of several channels, are gathered; only the last block is not full.
template <class T, class Take>
void forEachBlock(QorImageSize roi, int stored, Image<const T> src, Take take) {
    constexpr int whole = kernels::kHistogramBlock, padding = kernels::kBlockPadding;
    T block[whole];
    int held = 0;
    forEachRow(
        roi,
        [&](ptrdiff_t pixels, const T* row) {
            while (pixels > 0) {
                const int some = static_cast<int>(std::min<ptrdiff_t>(pixels, whole - held));
                if (some == whole && stored == 1) {
                    take(row, whole);
                } else {
                    copyChannel(row, some, stored, block + held);
                    held += some;
                    if (held == whole) {
                        take(static_cast<const T*>(block), whole);
                        held = 0;
                    }
                }
                row += ptrdiff_t{some} * stored;
                pixels -= some;
            }
        },
        walk(src, stored));
    if (held == 0) return;
    for (int x = held; x % padding != 0; ++x) block[x] = kernels::kPadding<T>;
    take(static_cast<const T*>(block), held);
}

/// Up to so many levels are compared with every element: cheaper than any search, and levels need no order.
template <class T>
constexpr int32_t kFewLevels = sizeof(T) == 2 ? 32 : 64;

inline int64_t pixelsOf(QorImageSize roi) { return int64_t{roi.width} * roi.height; }

/// Whether 16-bit elements are so few that each is searched for rather than that a bit is set for every level.
inline bool fewWords(QorImageSize roi, int32_t levels) { return pixelsOf(roi) <= 512 + levels / 4; }

/// Whether it pays to clear and to add up several counters of each place.
inline bool manyPerPlace(QorImageSize roi, uint32_t places) {
    return places <= kernels::PlaceCounters::kPlaces && pixelsOf(roi) >= 8 * int64_t{places};
}

template <class T, class L>
void compareAll(QorImageSize roi, int stored, Image<const T> src, Channel<L> out) {
    for (int32_t k = 0; k < out.count - 1; ++k) out.bins[k] = 0;
    forEachBlock(roi, stored, src,
                 [&](const T* block, int n) { kernels::countByComparison(block, n, out.levels, out.count, out.bins); });
}

/// Counts places straight in the bins: place `first` is that of bin 0, and `counted` bins have one.
template <class T, class Place>
void countInBins(QorImageSize roi, int stored, Image<const T> src, uint32_t first, uint32_t counted, int32_t* bins,
                 Place place) {
    uint32_t others = 0;
    forEachBlock(roi, stored, src, [&](const T* block, int n) {
        uint32_t places[kernels::kHistogramBlock];
        place(block, n, places);
        others += kernels::countPlaces(places, n, first, counted, bins);
    });
    bins[0] -= static_cast<int32_t>(others);
}

/// Elements among levels that never decrease.
template <class T, class L>
void searchAll(QorImageSize roi, int stored, Image<const T> src, Channel<L> out) {
    const auto place = [&](const T* block, int n, uint32_t* places) {
        kernels::placeBySearch(block, n, out.levels, out.count, places);
    };
    using Counters = kernels::PlaceCounters;
    const auto places = static_cast<uint32_t>(out.count) + 1;
    if (!manyPerPlace(roi, places)) {
        for (int32_t k = 0; k < out.count - 1; ++k) out.bins[k] = 0;
        return countInBins(roi, stored, src, 1, static_cast<uint32_t>(out.count) - 1, out.bins, place);
    }
    Counters counters(0, places);
    forEachBlock(roi, stored, src, [&](const T* block, int n) {
        uint32_t found[kernels::kHistogramBlock];
        place(block, n, found);
        counters.count<true>(found, n, 1, [](uint32_t p) { return p; });
    });
    counters.finish();
    for (int32_t k = 0; k < out.count - 1; ++k) {
        const auto bin = static_cast<uint32_t>(k);
        out.bins[k] = static_cast<int32_t>(counters.below(bin + 2) - counters.below(bin + 1));
    }
}

/// Moves the counts of the bins that hold values of T, which lie one after another from bin 0 on, to their places.
template <class T>
void spreadBins(const int32_t* levels, int32_t count, uint32_t counted, int32_t* bins) {
    const auto clamped = [](int32_t level) { return std::clamp(level, kLowest<T>, kLowest<T> + kValues<T>); };
    for (int32_t k = count - 2; k >= 0; --k)  // a bin moves up, if at all
        bins[k] = clamped(levels[k]) < clamped(levels[k + 1]) ? bins[--counted] : 0;
}

/// Adds to each bin what it holds of the counted places.
template <class Levels>
void addToBins(const kernels::PlaceCounters& counters, const Levels& levels, Channel<int32_t> out) {
    uint32_t below = counters.below(levels.placeOfLevel(out.levels[0]));
    for (int32_t k = 0; k < out.count - 1; ++k) {
        const uint32_t next = counters.below(levels.placeOfLevel(out.levels[k + 1]));
        if (out.levels[k] < out.levels[k + 1]) out.bins[k] += static_cast<int32_t>(next - below);
        below = next;
    }
}

/// 16 bits, levels in any order: counts as many places at a time as there are counters.
template <class T, class Levels>
void countPlaced(QorImageSize roi, int stored, Image<const T> src, const Levels& levels, Channel<int32_t> out) {
    using Counters = kernels::PlaceCounters;
    const uint32_t places = levels.last() + 1;
    const auto place = [&levels](T value) { return levels.place(value); };
    for (uint32_t first = 0; first < places; first += Counters::kPlaces) {
        Counters counters(first, places - first);
        const auto countRow = [&](ptrdiff_t pixels, const T* row) {
            if (places <= Counters::kPlaces)
                counters.count<true>(row, pixels, stored, place);
            else
                counters.count<false>(row, pixels, stored, place);
        };
        forEachRow(roi, countRow, walk(src, stored));
        counters.finish();
        addToBins(counters, levels, out);
    }
}

/// 16 bits, each level the one before and 1: a bin for each value.
template <class T>
void countValues(QorImageSize roi, int stored, Image<const T> src, Channel<int32_t> out) {
    for (int32_t k = 0; k < out.count - 1; ++k) out.bins[k] = 0;
    const auto place = [&](const T* block, int n, uint32_t* places) {
        for (int x = 0; x < n; ++x) places[x] = static_cast<uint32_t>(int32_t{block[x]});
    };
    countInBins(roi, stored, src, static_cast<uint32_t>(out.levels[0]), static_cast<uint32_t>(out.count) - 1, out.bins,
                place);
}

/// 16 bits, levels in any order.
template <class T>
void placeWords(QorImageSize roi, int stored, Image<const T> src, Channel<int32_t> out, bool ordered) {
    for (int32_t k = 0; k < out.count - 1; ++k) out.bins[k] = 0;
    const kernels::EvenWordPlaces even(out.levels, out.count, kLowest<T>);
    if (manyPerPlace(roi, even.last() + 1)) return countPlaced(roi, stored, src, even, out);
    const kernels::AnyWordPlaces any(out.levels, out.count, kLowest<T>);
    if (!ordered || manyPerPlace(roi, any.last() + 1)) return countPlaced(roi, stored, src, any, out);
    // The places below the first level and from the last one on are in no bin.
    const uint32_t first = any.placeOfLevel(out.levels[0]);
    const uint32_t counted = any.placeOfLevel(out.levels[out.count - 1]) - first;
    const auto place = [&](const T* block, int n, uint32_t* places) {
        for (int x = 0; x < n; ++x) places[x] = any.place(block[x]);
    };
    countInBins(roi, stored, src, first, counted, out.bins, place);
    if (counted < static_cast<uint32_t>(out.count) - 1) spreadBins<T>(out.levels, out.count, counted, out.bins);
}

/// One channel, element by element; src starts at its first one.
template <class T>
QORI_NOINLINE void countByLevels(QorImageSize roi, int stored, Image<const T> src, Channel<Level<T>> out) {
    if (out.count <= kFewLevels<T>) return compareAll(roi, stored, src, out);
    const bool ordered = kernels::neverDecreasing(out.levels, out.count);
    if constexpr (sizeof(T) == 2) {
        if (ordered && kernels::increaseByOne(out.levels, out.count)) return countValues(roi, stored, src, out);
        if (!ordered || !fewWords(roi, out.count)) return placeWords(roi, stored, src, out, ordered);
    } else if (!ordered) {
        return compareAll(roi, stored, src, out);
    }
    searchAll(roi, stored, src, out);
}

/// Whether it pays to clear and to add up a counter of every 16-bit value.
inline bool tablePays(QorImageSize roi, const Channel<int32_t>* out, int n) {
    int32_t most = 0;
    for (int c = 0; c < n; ++c) most = std::max(most, out[c].count);
    return pixelsOf(roi) >= 32'768 && most > static_cast<int32_t>(kernels::PlaceCounters::kPlaces) + 1;
}

template <class T, Layout layout>
void countDirectly(QorImageSize roi, Image<const T> src, const Channel<Level<T>>* out) {
    if constexpr (sizeof(T) == 1) {
        countBytes<layout>(roi, src, out);
    } else {
        // The channels of one image; each starts at its own element.
        for (int c = 0; c < processedChannels(layout); ++c)
            countByLevels<T>(roi, channels(layout), {src.data + c, src.step}, out[c]);
    }
}

}  // namespace qori::stats
