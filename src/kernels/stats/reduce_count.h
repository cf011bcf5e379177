// SPDX-License-Identifier: Apache-2.0
// Counts of elements within bounds, per channel; arranged as in reduce.h.
#pragma once
#include "kernels/map.h"
#include "reduce.h"
#include "reduce_extrema.h"
#include "reduce_lanes.h"

namespace qori::kernels {

/// 8-bit counts, which are emptied before a lane has counted 256.
template <class T>
struct CountLanes {
    using Next = SumLanes<uint8_t>;
    static constexpr int banks = 1;
    static constexpr ptrdiff_t limit = 255;

    Vec<T> counts;

    /// Matching lanes are all ones, that is -1.
    QORI_INLINE void add(Mask<T> matches) { counts = counts - Vec<T>{matches.v}; }
    void spillTo(Next& next) const { next.add(counts); }
};

template <>
struct CountLanes<float> {
    using Total = uint64_t;
    static constexpr int banks = 1, count = 8;
    static constexpr ptrdiff_t limit = UINT32_MAX / 2;

    Vec<uint32_t> counts;

    QORI_INLINE void add(Mask<float> matches) { counts = counts - Vec<uint32_t>{matches.v}; }
    void values(Total* out) const {
        uint32_t words[count];
        store(words, counts);
        detail::widen(words, out);
    }
};

template <class T>
struct Bounds {
    ChannelVectors<T> lower, upper;

    /// The lanes within the bounds. NaN is in no range.
    QORI_INLINE Mask<T> matches(int phase, Vec<T> a) const {
        if constexpr (std::is_same_v<T, float>)
            return isAtMost(lower.v[phase], a) & isAtMost(a, upper.v[phase]);
        else
            return isEqual(smaller(larger(a, lower.v[phase]), upper.v[phase]), a);
    }
};

template <class T>
using Counts = Accumulators<CountLanes<T>>;

template <class T>
QORI_NOINLINE void countRow(Counts<T>& counts, const Bounds<T>& bounds, int channels, ptrdiff_t elements,
                            const T* src) {
    constexpr int n = Vec<T>::lanes;
    ptrdiff_t i = 0;
    while (elements - i >= 3 * n) {
        CountLanes<T> lanes[3] = {counts.lanes[0], counts.lanes[1], counts.lanes[2]};
        const ptrdiff_t rounds = std::min((elements - i) / (3 * n), counts.left);
        for (const ptrdiff_t end = i + rounds * 3 * n; i < end; i += 3 * n)
            for (int v = 0; v < 3; ++v) lanes[v].add(bounds.matches(v, load(src + i + v * n)));
        for (int v = 0; v < 3; ++v) counts.lanes[v] = lanes[v];
        if ((counts.left -= rounds) == 0) counts.spill(channels);
    }
    if (i == elements) return;
    for (int v = 0; i < elements; i += n, ++v) {
        const ptrdiff_t rest = elements - i;
        const Mask<T> own = firstLanes<T>(rest < n ? rest : n);
        counts.lanes[v].add(own & bounds.matches(v, loadUpTo(src + i, rest)));
    }
    if (--counts.left == 0) counts.spill(channels);
}

}  // namespace qori::kernels
