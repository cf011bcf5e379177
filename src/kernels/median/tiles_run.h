// SPDX-License-Identifier: Apache-2.0
// What tiles of medians compute. Only the files that instantiate it include this, one for each type of keys.
#pragma once
#include <algorithm>

#include "fixed_merges.h"
#include "tiles.h"

namespace qori::kernels {
namespace tiles {

template <int lists, class V>
QORI_INLINE void compare(const Comparators& comparators, V* a, V* b) {
    static_assert(sizeof(V) == 8 * kPlacesPerVector);
    const auto at = [](V * base, int place) __attribute__((always_inline))->V& {
        return *reinterpret_cast<V*>(reinterpret_cast<uint8_t*>(base) + ptrdiff_t{8} * place);
    };
    const Comparator* const end = comparators.list + comparators.count;
    for (const Comparator* c = comparators.list; c != end; ++c) {
        const int low = c->low, high = c->high;
        V x = at(a, low), y = at(a, high);
        order(x, y);
        at(a, low) = x, at(a, high) = y;
        if constexpr (lists == 2) {
            x = at(b, low), y = at(b, high);
            order(x, y);
            at(b, low) = x, at(b, high) = y;
        }
    }
}

template <class V>
struct Operands {
    const V *first, *second;
    V* to;
};

template <class V>
QORI_INLINE void mergeFirstStep(const Merge& merge, const Operands<V>& o) {
    for (int32_t i = 0; i < merge.paired; ++i) {
        V x = o.first[i], y = o.second[i + merge.skipped];
        order(x, y);
        o.to[i] = x, o.to[merge.first + merge.skipped + i] = y;
    }
    for (int32_t i = merge.paired; i < merge.first; ++i) o.to[i] = o.first[i];
    for (int32_t i = 0; i < merge.skipped; ++i) o.to[merge.first + i] = o.second[i];
}

template <class V>
QORI_NOINLINE void mergeOne(const Merge& merge, const Operands<V>& a) {
    if (merge.fixed >= 0) return kFixedMerges<V>[static_cast<size_t>(merge.fixed)](a.first, a.second, a.to);
    mergeFirstStep(merge, a);
    compare<1>(merge.rest, a.to, a.to);
}

/// Two merges of a kind, which read the list of comparators together.
template <class V>
QORI_NOINLINE void mergeTwo(const Merge& merge, const Operands<V>& a, const Operands<V>& b) {
    if (merge.fixed >= 0) {
        const FixedMerge<V> fixed = kFixedMerges<V>[static_cast<size_t>(merge.fixed)];
        fixed(a.first, a.second, a.to);
        fixed(b.first, b.second, b.to);
        return;
    }
    mergeFirstStep(merge, a);
    mergeFirstStep(merge, b);
    compare<2>(merge.rest, a.to, b.to);
}

inline constexpr int32_t kMostStraight = 14;

/// A run of so many elements, of which the list is.
template <class V>
QORI_NOINLINE void sortOne(const Comparators& sort, int32_t length, V* a) {
    switch (length) {
        case 2: return sortStraight<2>(a);
        case 4: return sortStraight<4>(a);
        case 6: return sortStraight<6>(a);
        case 8: return sortStraight<8>(a);
        case 10: return sortStraight<10>(a);
        case 12: return sortStraight<12>(a);
        case 14: return sortStraight<14>(a);
        default: return compare<1>(sort, a, a);
    }
}
template <class V>
QORI_NOINLINE void sortTwo(const Comparators& sort, int32_t length, V* a, V* b) {
    if (length > kMostStraight || length % 2 != 0) return compare<2>(sort, a, b);
    sortOne(sort, length, a);
    sortOne(sort, length, b);
}

/// The element of that rank of two ascending runs: wherever the first so many of one and the rest of the other are
/// taken, the largest of them is not below it, and once it is it.
template <class V>
QORI_NOINLINE V selectOfTwo(const V* a, int32_t aCount, const V* b, int32_t bCount, int32_t rank) {
    const int32_t taken = rank + 1, least = std::max(1, taken - bCount), most = std::min(aCount, taken - 1);
    V result = taken <= bCount ? b[taken - 1] : a[taken - 1];
    if (taken <= bCount && taken <= aCount) result = lower(result, a[taken - 1]);
    for (int32_t i = least; i <= most; ++i) result = lower(result, upper(a[i - 1], b[taken - i - 1]));
    return result;
}

template <class V>
const V* MergeTree<V>::run(const V* runs) const {
    for (int k = 0; k < rounds_; ++k) {
        const Round& round = round_[k];
        V* const to = buffers_[k % 2];
        const ptrdiff_t n = round.length;
        const auto operands = [=](int32_t i) {
            return Operands<V>{runs + 2 * i * n, runs + (2 * i + 1) * n, to + 2 * i * n};
        };
        const bool hasTail = round.tail.first != 0;
        const int32_t whole = round.runs / 2 - hasTail;
        int32_t i = 0;
        for (; i + 2 <= whole; i += 2) mergeTwo(round.whole, operands(i), operands(i + 1));
        if (i < whole) mergeOne(round.whole, operands(i));
        if (hasTail) mergeOne(round.tail, operands(whole));
        if (round.runs % 2 != 0) std::copy_n(runs + 2 * whole * n, round.last, to + 2 * whole * n);
        runs = to;
    }
    return runs;
}

template <class V>
template <int runs, int length, int round>
QORI_INLINE const V* MergeTree<V>::runFixed(const V* from) const {
    if constexpr (runs == 1) {
        return from;
    } else {
        V* const to = buffers_[round % 2];
        for (int i = 0; i < runs; i += 2)
            mergeFixed<kWholeMerge<length, length>>(from + i * length, from + (i + 1) * length, to + i * length);
        return runFixed<runs / 2, 2 * length, round + 1>(to);
    }
}

}  // namespace tiles

template <class K>
void MedianTiles<K>::run(const K* const* rows, const ptrdiff_t* columns, V* medians) {
    at_ = {rows, columns};
    to_ = medians;
    const int32_t left = tile_.width - 1, top = tile_.height - 1, seen = mask_.width + left;
    for (int32_t x = 0; x < seen; ++x)
        for (int32_t i = 0; i < columnLength_; ++i) columns_[x * columnLength_ + i] = element(x, top + i);
    int32_t x = 0;
    for (; x + 2 <= seen; x += 2)
        tiles::sortTwo(columnSort_, columnLength_, columns_ + x * columnLength_, columns_ + (x + 1) * columnLength_);
    if (x < seen) tiles::sortOne(columnSort_, columnLength_, columns_ + x * columnLength_);
    for (int32_t y = 0; y < top; ++y) {
        V *const above = rows_ + y * rowLength_, *const beneath = rows_ + (top + y) * rowLength_;
        for (int32_t i = 0; i < rowLength_; ++i) {
            above[i] = element(left + i, y);
            beneath[i] = element(left + i, mask_.height + y);
        }
        tiles::sortTwo(rowSort_, rowLength_, above, beneath);
    }
    const V* const core = core_.run(columns_ + left * columnLength_) + coreBegin_;
    const Extras columnsBeside{columns_, columns_ + mask_.width * columnLength_, columnLength_};
    const Extras rowsBeside{rows_, rows_ + top * rowLength_, rowLength_};
    if (mask_.width != mask_.height || !halveSquareOf<tiles::kLeastFixed>(core, columnsBeside, rowsBeside))
        halve(levels_, core, columnsBeside, rowsBeside, {0, 0});
}

template <class K>
void MedianTiles<K>::halve(const Level* level, const V* core, Extras columns, Extras rows, QorPoint2D at) {
    const bool across = level->isAcross;
    const Extras &along = across ? columns : rows, &other = across ? rows : columns;
    const V* const added[2] = {level->added[0].run(along.before + (level->half - 1) * along.length),
                               level->added[1].run(along.behind)};
    const QorPoint2D half[2] = {at,
                                across ? QorPoint2D{at.x + level->half, at.y} : QorPoint2D{at.x, at.y + level->half}};
    if (level->isLast) {
        for (int k = 0; k < 2; ++k)
            to_[half[k].y * tile_.width + half[k].x] =
                tiles::selectOfTwo(core, level->coreCount, added[k], level->addedCount(), level->rank);
        return;
    }
    tiles::mergeTwo<V>(level->core, {core, added[0], level->cores[0]}, {core, added[1], level->cores[1]});
    lengthen(level, other, at);
    const ptrdiff_t longLength = level->corners.length(), below = level->others * longLength;
    for (int k = 0; k < 2; ++k) {
        const ptrdiff_t skipped = k == 0 ? 0 : level->half * along.length;
        const Extras same{along.before + skipped, along.behind + skipped, along.length};
        const Extras longer{level->longer[k], level->longer[k] + below, longLength};
        halve(level + 1, level->cores[k] + level->begin, across ? same : longer, across ? longer : same, half[k]);
    }
}

template <class K>
void MedianTiles<K>::lengthen(const Level* level, const Extras& other, QorPoint2D at) {
    const bool across = level->isAcross;
    const int32_t mask = across ? mask_.width : mask_.height, otherMask = across ? mask_.height : mask_.width;
    const int32_t begin[2] = {(across ? at.x : at.y) + level->half - 1, (across ? at.x : at.y) + mask};
    for (int side = 0; side < 2; ++side)
        for (int32_t i = 0; i < level->others; ++i) {
            const int32_t line = (across ? at.y : at.x) + i + (side == 0 ? 0 : otherMask);
            for (int k = 0; k < 2; ++k)
                for (int32_t j = 0; j < level->half; ++j)
                    level->corner[k][j] = across ? element(begin[k] + j, line) : element(line, begin[k] + j);
            if (level->half > 1) tiles::sortTwo(level->cornerSort, level->half, level->corner[0], level->corner[1]);
            const V* const run = (side == 0 ? other.before : other.behind) + i * other.length;
            const ptrdiff_t to = (side * level->others + i) * ptrdiff_t{level->corners.length()};
            tiles::mergeTwo<V>(level->corners, {run, level->corner[0], level->longer[0] + to},
                               {run, level->corner[1], level->longer[1] + to});
        }
}

// --- square masks: the same, of constants ---------------------------------------------------------------------------

/// False where the mask's side is neither that nor a larger one of those that have code.
template <class K>
template <int side>
bool MedianTiles<K>::halveSquareOf(const V* core, Extras columns, Extras rows) {
    if (mask_.width == side) {
        halveSquare<side, 0>(core, columns, rows, {0, 0});
        return true;
    }
    if constexpr (side + 2 <= tiles::mostFixed(V::lanes)) return halveSquareOf<side + 2>(core, columns, rows);
    return false;
}

template <class K>
template <int side, int index>
void MedianTiles<K>::halveSquare(const V* core, Extras columns, Extras rows, QorPoint2D at) {
    constexpr tiles::Halving h = tiles::kHalvings<side>.level[index];
    const Level& level = levels_[index];
    const Extras &along = h.isAcross ? columns : rows, &other = h.isAcross ? rows : columns;
    const V* const added[2] = {
        level.added[0].template runFixed<h.half, h.length>(along.before + (h.half - 1) * h.length),
        level.added[1].template runFixed<h.half, h.length>(along.behind)};
    const QorPoint2D half[2] = {at, h.isAcross ? QorPoint2D{at.x + h.half, at.y} : QorPoint2D{at.x, at.y + h.half}};
    if constexpr (h.isLast) {
        for (int k = 0; k < 2; ++k)
            to_[half[k].y * tiles::kHalvings<side>.tile.width + half[k].x] =
                tiles::selectStraight<h.coreCount, h.addedCount(), h.rank>(core, added[k]);
    } else {
        constexpr int number = tiles::numberOfFixed({h.coreCount, h.addedCount(), h.begin, h.end});
        for (int k = 0; k < 2; ++k) tiles::mergeFixed<number>(core, added[k], level.cores[k]);
        lengthenSquare<side, index>(other, at);
        constexpr ptrdiff_t longLength = h.otherLength + h.half;
        for (int k = 0; k < 2; ++k) {
            const ptrdiff_t skipped = k == 0 ? 0 : h.half * h.length;
            const Extras same{along.before + skipped, along.behind + skipped, h.length};
            const Extras longer{level.longer[k], level.longer[k] + h.others * longLength, longLength};
            halveSquare<side, index + 1>(level.cores[k] + h.begin, h.isAcross ? same : longer,
                                         h.isAcross ? longer : same, half[k]);
        }
    }
}

template <class K>
template <int side, int index>
void MedianTiles<K>::lengthenSquare(const Extras& other, QorPoint2D at) {
    constexpr tiles::Halving h = tiles::kHalvings<side>.level[index];
    constexpr ptrdiff_t longLength = h.otherLength + h.half;
    const Level& level = levels_[index];
    const int32_t first = h.isAcross ? at.x : at.y, firstLine = h.isAcross ? at.y : at.x;
    V* to[2] = {level.longer[0], level.longer[1]};
    for (int beyond = 0; beyond < 2; ++beyond) {
        const V* run = beyond == 0 ? other.before : other.behind;
        for (int32_t i = 0; i < h.others; ++i, run += h.otherLength) {
            const int32_t line = firstLine + i + (beyond == 0 ? 0 : side);
            for (int k = 0; k < 2; ++k, to[k - 1] += longLength) {
                const int32_t from = first + (k == 0 ? h.half - 1 : side);
                V corner[h.half];
                for (int32_t j = 0; j < h.half; ++j)
                    corner[j] = h.isAcross ? element(from + j, line) : element(line, from + j);
                if constexpr (h.half > 1) tiles::sortStraight<h.half>(corner);
                tiles::mergeFixed<tiles::kWholeMerge<h.otherLength, h.half>>(run, corner, to[k]);
            }
        }
    }
}

}  // namespace qori::kernels
