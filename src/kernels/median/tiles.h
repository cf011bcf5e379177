// SPDX-License-Identifier: Apache-2.0
// Medians of tiles of pixels, each lane a tile (Adams: Fast median filters using separable sorting networks, 2021). The
// elements that all windows of a tile share, its core, are put in order once. So are the extra ones beside the core, by
// columns, and those above and below it, by rows. A tile is then halved again and again: each half's windows share
// more, the core is joined by the extra runs that they all see, and whatever is too small or too large to be the median
// of any of them is dropped. What is left for a single pixel is one selection of two runs.
#pragma once
#include <algorithm>
#include <utility>

#include "order.h"
#include "tile_shapes.h"

namespace qori::kernels {
namespace tiles {

/// Elements as keys of tiles: 16-bit ones of both kinds as signed ones, which halves the code.
template <class T>
using TileKey = std::conditional_t<std::is_same_v<T, uint16_t>, int16_t, Key<T>>;

template <class T>
QORI_INLINE Vec<TileKey<T>> tileKeysOf(Vec<T> a) {
    if constexpr (std::is_same_v<T, uint16_t>)
        return {(a ^ splat<uint16_t>(0x8000)).v};
    else
        return keysOf(a);
}
template <class T>
QORI_INLINE Vec<T> elementsOfTile(Vec<TileKey<T>> keys) {
    if constexpr (std::is_same_v<T, uint16_t>)
        return Vec<T>{keys.v} ^ splat<uint16_t>(0x8000);
    else
        return elementsOf<T>(keys);
}

template <class Memory>
Comparators sortOf(Memory& memory, int32_t n) {
    Comparators sort{memory.template take<Comparator>(comparators::mostToSort(n)), 0};
    if (sort.list != nullptr) comparators::makeSort(n, sort);
    return sort;
}

template <class V, class Memory>
Merge mergeOf(Memory& memory, int32_t first, int32_t second, int32_t begin, int32_t end) {
    Merge merge;
    merge.first = first, merge.second = second, merge.begin = begin, merge.end = end;
    merge.fixed = numberOfFixed({first, second, begin, end}, kFixedCount<V>);
    if (merge.fixed >= 0) return merge;
    merge.rest.list = memory.template take<Comparator>(comparators::mostToMerge(first, second));
    comparators::pairRuns(merge);
    if (merge.rest.list != nullptr) comparators::listSteps(merge);
    return merge;
}

/// Runs of equal length, the last one perhaps shorter, merged by twos until one is left.
template <class V>
class MergeTree {
public:
    MergeTree() = default;
    template <class Memory>
    MergeTree(Memory& memory, int32_t runs, int32_t length) {
        int32_t last = length;
        for (int32_t all = (runs - 1) * length + last; runs > 1; ++rounds_) {
            Round& round = round_[rounds_];
            round.runs = runs, round.length = length, round.last = last;
            const bool evens = runs % 2 == 0;
            const auto make = [&](int32_t second) { return mergeOf<V>(memory, length, second, 0, length + second); };
            if (runs > 2 || last == length) round.whole = make(length);
            if (evens && last != length) round.tail = make(last);
            last += evens ? length : 0;
            length *= 2;
            runs = (runs + 1) / 2;
            for (auto& buffer : buffers_)
                if (buffer == nullptr) buffer = memory.template take<V>(all);
        }
    }

    /// Two trees of a kind have buffers of their own each.
    const V* run(const V* runs) const;
    /// The same of a square mask: so many runs of one length, a power of two of them.
    template <int runs, int length, int round = 0>
    const V* runFixed(const V* from) const;

private:
    struct Round {
        int32_t runs, length, last;
        Merge whole, tail;
    };
    static constexpr int kMostRounds = 6;

    int rounds_ = 0;
    Round round_[kMostRounds] = {};
    V* buffers_[2] = {};
};

}  // namespace tiles

/// One tile per lane. The tiles have the shape that tiles::sideOf says for both sides of the mask.
template <class K>
class MedianTiles {
    using V = Vec<K>;

public:
    /// Takes its memory from that of Memory, which hands out or measures: take<Type>(count).
    template <class Memory>
    MedianTiles(Memory& memory, QorImageSize mask) : mask_(mask) {
        const tiles::Halvings halvings(mask);
        const QorImageSize core = halvings.core;
        tile_ = halvings.tile;
        columnLength_ = core.height, rowLength_ = core.width;
        columns_ = memory.template take<V>((mask.width + tile_.width - 1) * core.height);
        rows_ = memory.template take<V>(2 * (tile_.height - 1) * core.width);
        columnSort_ = tiles::sortOf(memory, core.height);
        rowSort_ = tiles::sortOf(memory, core.width);
        core_ = tiles::MergeTree<V>(memory, core.width, core.height);
        coreBegin_ = tiles::Ranks(core.width * core.height, mask.width * mask.height).begin;
        for (size_t i = 0; i < static_cast<size_t>(halvings.levels); ++i)
            makeLevel(memory, halvings.level[i], levels_[i]);
    }

    QorImageSize tile() const { return tile_; }
    /// Of source elements that the windows of a tile see.
    QorImageSize footprint() const { return {mask_.width + tile_.width - 1, mask_.height + tile_.height - 1}; }

    /// rows[y] + columns[x]: the elements at (x, y) of the footprints of all lanes. Medians by rows of the tile.
    void run(const K* const* rows, const ptrdiff_t* columns, V* medians);

private:
    /// Ordered runs of elements that some windows of a tile see and others do not, on both sides of the core.
    struct Extras {
        const V *before, *behind;
        ptrdiff_t length;
    };
    /// How tiles of one size are halved, and where their halves are kept.
    struct Level : tiles::Halving {
        tiles::MergeTree<V> added[2];
        Merge core, corners;
        Comparators cornerSort;
        V *cores[2], *longer[2], *corner[2];
    };
    struct Elements {
        const K* const* rows;
        const ptrdiff_t* columns;
    };

    template <class Memory>
    void makeLevel(Memory& memory, const tiles::Halving& halving, Level& level) {
        static_cast<tiles::Halving&>(level) = halving;
        for (auto& tree : level.added) tree = tiles::MergeTree<V>(memory, level.half, level.length);
        if (level.isLast) return;
        level.core = tiles::mergeOf<V>(memory, level.coreCount, level.addedCount(), level.begin, level.end);
        level.corners = tiles::mergeOf<V>(memory, level.otherLength, level.half, 0, level.otherLength + level.half);
        level.cornerSort = tiles::sortOf(memory, level.half);
        for (int k = 0; k < 2; ++k) {
            level.cores[k] = memory.template take<V>(level.core.length());
            level.longer[k] = memory.template take<V>(2 * level.others * level.corners.length());
            level.corner[k] = memory.template take<V>(level.half);
        }
    }

    QORI_INLINE V element(int32_t x, int32_t y) const { return load(at_.rows[y] + at_.columns[x]); }

    /// The medians of a tile at that pixel, given its core and the extra runs of columns and of rows.
    void halve(const Level* level, const V* core, Extras columns, Extras rows, QorPoint2D at);
    template <int side>
    bool halveSquareOf(const V* core, Extras columns, Extras rows);
    template <int side, int index>
    QORI_NOINLINE void halveSquare(const V* core, Extras columns, Extras rows, QorPoint2D at);
    template <int side, int index>
    QORI_NOINLINE void lengthenSquare(const Extras& other, QorPoint2D at);
    /// The extra runs of the other side reach as far as the halves' cores, and so beyond the tile's by corners.
    void lengthen(const Level* level, const Extras& other, QorPoint2D at);

    QorImageSize mask_, tile_;
    int32_t columnLength_ = 0, rowLength_ = 0, coreBegin_ = 0;
    V *columns_ = nullptr, *rows_ = nullptr, *to_ = nullptr;
    Comparators columnSort_, rowSort_;
    tiles::MergeTree<V> core_;
    Level levels_[tiles::kMostLevels] = {};
    Elements at_{};
};

extern template class MedianTiles<uint8_t>;
extern template class MedianTiles<int16_t>;
extern template class MedianTiles<int32_t>;

}  // namespace qori::kernels
