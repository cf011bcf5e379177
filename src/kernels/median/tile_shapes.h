// SPDX-License-Identifier: Apache-2.0
// How tiles of medians are halved: lengths and ranks, which depend on the mask alone.
#pragma once
#include <algorithm>
#include <array>

#include "comparators.h"
#include "image/image.h"

namespace qori::kernels::tiles {

/// Pixels along one side of a tile for so many elements of a mask: windows share at least half of them.
constexpr int sideOf(int32_t mask) { return mask < 3 ? 1 : mask < 7 ? 2 : mask < 9 ? 4 : mask < 25 ? 8 : 16; }

inline constexpr int32_t kMostMask = 63, kMostSide = 16, kMostFootprint = kMostMask + kMostSide - 1;
inline constexpr int kMostLevels = 8;

/// Ranks in an ordered part of a window, of those that can be the median of the whole.
struct Ranks {
    int32_t begin, end;
    constexpr Ranks(int32_t part, int32_t window)
        : begin(std::max(0, part - 1 - window / 2)), end(std::min(part, window / 2 + 1)) {}
    constexpr int32_t count() const { return end - begin; }
};

/// Tiles of one size become two halves each.
struct Halving {
    bool isAcross = false;       ///< Left and right half; else upper and lower.
    bool isLast = false;         ///< Halves are single pixels.
    int32_t half = 0;            ///< Pixels of a half along the side that is halved.
    int32_t others = 0;          ///< Extra runs along the other side, on each side of the core ...
    int32_t otherLength = 0;     ///< ... and how long they are: the halves' are longer by `half`.
    int32_t length = 0;          ///< Of the extra runs of which `half` join the core.
    int32_t coreCount = 0;       ///< Elements of the core that can be medians,
    int32_t rank = 0;            ///< where the median is among them if nothing joins below it,
    int32_t begin = 0, end = 0;  ///< and which ranks can be that with the added ones.

    constexpr int32_t addedCount() const { return half * length; }
};

struct Halvings {
    QorImageSize tile{}, core{};
    std::array<Halving, kMostLevels> level{};
    int levels = 0;

    constexpr explicit Halvings(QorImageSize mask)
        : tile{sideOf(mask.width), sideOf(mask.height)},
          core{mask.width - tile.width + 1, mask.height - tile.height + 1} {
        const int32_t window = mask.width * mask.height;
        QorImageSize now = tile, inside = core;
        for (int32_t n = core.width * core.height; now.width > 1 || now.height > 1; ++levels) {
            Halving& h = level[static_cast<size_t>(levels)];
            h.isAcross = now.width >= now.height;
            int32_t &side = h.isAcross ? now.width : now.height, &grows = h.isAcross ? inside.width : inside.height;
            side /= 2;
            h.half = side;
            h.isLast = now.width == 1 && now.height == 1;
            h.others = (h.isAcross ? now.height : now.width) - 1;
            h.otherLength = grows;
            h.length = h.isAcross ? inside.height : inside.width;
            const Ranks before(n, window), after(n += h.addedCount(), window);
            h.coreCount = before.count();
            h.rank = window / 2 - before.begin;
            h.begin = after.begin - before.begin;
            h.end = after.end - before.begin;
            grows += side;
        }
    }
};

struct MergeShape {
    int32_t first = 0, second = 0, begin = 0, end = 0;
    constexpr bool operator==(const MergeShape&) const = default;
};

inline constexpr int32_t kLongestFixed = 264, kLeastFixed = 7;

/// Square masks from kLeastFixed to these have code of their own, by lanes of a vector: others are faster by
/// histograms.
constexpr int32_t mostFixed(int lanes) { return lanes == 32 ? 15 : lanes == 16 ? 21 : 19; }

/// How the tiles of square masks are halved.
template <int side>
inline constexpr Halvings kHalvings{QorImageSize{side, side}};

/// The merges of square masks that have code of their own, from small masks to large ones.
struct FixedShapes {
    std::array<MergeShape, 140> shape{};
    int count = 0, countUpTo[mostFixed(16) + 1]{};

    constexpr void add(MergeShape s) {
        for (int i = 0; i < count; ++i)
            if (shape[static_cast<size_t>(i)] == s) return;
        shape[static_cast<size_t>(count++)] = s;
    }
    constexpr FixedShapes() {
        for (int32_t side = kLeastFixed; side <= mostFixed(16); side += 2) {
            const Halvings halvings(QorImageSize{side, side});
            for (int i = 0; i < halvings.levels; ++i) {
                const Halving& h = halvings.level[static_cast<size_t>(i)];
                for (int32_t runs = h.half, n = h.length; runs > 1; runs /= 2, n *= 2) add({n, n, 0, 2 * n});
                if (h.isLast) continue;
                add({h.coreCount, h.addedCount(), h.begin, h.end});
                if (h.others > 0) add({h.otherLength, h.half, 0, h.otherLength + h.half});
            }
            countUpTo[side] = count;
        }
    }
};
inline constexpr FixedShapes kFixedShapes;

/// How many of them elements of a vector have.
template <class V>
inline constexpr int kFixedCount = kFixedShapes.countUpTo[mostFixed(V::lanes)];

/// Its number among so many of them, or -1.
constexpr int numberOfFixed(const MergeShape& shape, int count = kFixedShapes.count) {
    for (int i = 0; i < count; ++i)
        if (kFixedShapes.shape[static_cast<size_t>(i)] == shape) return i;
    return -1;
}

}  // namespace qori::kernels::tiles
