// SPDX-License-Identifier: Apache-2.0
// Reductions of a region to one number per channel: one row loop for every measure, type and layout.
//
// Elements are taken in rounds of three vectors (or a multiple). Three vectors hold a whole number of pixels of 1, 3
// and 4 channels, so an accumulator lane sees one channel only, in every row, and layouts share their code: channels
// are told apart once, at the end. AC4 is four channels of which the last is not asked for.
//
// A measure says what is accumulated:
//     Lanes                            accumulators of one vector position, see reduce_lanes.h
//     static void feed(Lanes&, Vec<T>...)   adds one vector of each source; zeros add nothing
// Lanes offer
//     Total                            type of the sum of all lanes between two spills
//     static constexpr int banks       vectors of a round, in threes: more than 3 where latency would bind
//     static constexpr ptrdiff_t limit rounds before a lane could overflow
//     optionally  takesTwo             lanes are fed with VectorPair, and a round has as many vectors again
//     optionally  loadVector(p) and loadRest(p, n)   where vectors are not simply loaded; n may reach a vector
//     and either  values(Total*)       one value per element position
//     or          Next, spillTo(Next&) wider accumulators that take over before the limit
//     optionally  static Total join(Total, Total)   what brings lanes together if not +
#pragma once
#include <algorithm>

#include "reduce_lanes.h"
#include "reduce_totals.h"

namespace qori::kernels {

namespace detail {

template <class Lanes>
constexpr bool joinsOwnWay = requires(typename Lanes::Total t) {
    Lanes::join(t, t);
};

/// Sums of integers may outgrow 64 bits over a region; largest values and floats stay what they are.
template <class Lanes>
using WholeTotal = std::conditional_t<std::is_integral_v<typename Lanes::Total> && !joinsOwnWay<Lanes>, WideTotal,
                                      typename Lanes::Total>;

template <class Lanes>
constexpr auto join(typename Lanes::Total a, typename Lanes::Total b) {
    if constexpr (joinsOwnWay<Lanes>)
        return Lanes::join(a, b);
    else
        return static_cast<typename Lanes::Total>(a + b);
}

template <class Lanes>
QORI_INLINE void addTotal(WideTotal& total, typename Lanes::Total own) {
    total.add(own);
}
template <class Lanes>
QORI_INLINE void addTotal(typename Lanes::Total& total, typename Lanes::Total own) {
    total = join<Lanes>(total, own);
}

/// Brings the values of each channel together, which alternate: halves onto each other as long as they begin with the
/// same channel, which compilers turn into vectors and which keeps float rounding to the depth of a tree.
template <class Lanes, int count>
void joinChannels(typename Lanes::Total* values, int channels, WholeTotal<Lanes>* totals) {
    int n = count;
    // Pixels, without a division whose divisor is only known now.
    for (int pixels = channels == 1   ? count
                      : channels == 3 ? count / 3
                                      : count / 4;
         pixels % 2 == 0; pixels /= 2, n /= 2)
        for (int i = 0; i < n / 2; ++i) values[i] = join<Lanes>(values[i], values[n / 2 + i]);
    for (int c = 0; c < channels; ++c) {
        typename Lanes::Total own = values[c];
        for (int i = c + channels; i < n; i += channels) own = join<Lanes>(own, values[i]);
        addTotal<Lanes>(totals[c], own);
    }
}

template <class Lanes>
constexpr bool takesTwo = requires {
    Lanes::takesTwo;
};

template <class Lanes, class T>
QORI_INLINE auto loadFor(const T* p) {
    if constexpr (requires { Lanes::loadVector(p); })
        return Lanes::loadVector(p);
    else if constexpr (takesTwo<Lanes>)
        return VectorPair<T>{load(p), load(p + 3 * Vec<T>::lanes)};
    else
        return load(p);
}

/// Up to one vector.
template <class Lanes, class T>
QORI_INLINE auto loadRestFor(const T* p, ptrdiff_t n) {
    if constexpr (requires { Lanes::loadRest(p, n); })
        return Lanes::loadRest(p, n);
    else if constexpr (takesTwo<Lanes>)
        return VectorPair<T>{loadUpTo(p, n), zero<T>()};
    else
        return loadUpTo(p, n);
}

}  // namespace detail

/// Accumulators of a whole reduction; lives on the family function's stack.
template <class L, int vectorCount = 3 * L::banks>
struct Accumulators {
    static constexpr int vectors = vectorCount;

    L lanes[vectors] = {};
    ptrdiff_t left = L::limit;  ///< Rounds until the lanes must be emptied.
    detail::WholeTotal<L> totals[4] = {};

    /// Empties the lanes into the totals.
    QORI_NOINLINE void spill(int channels) {
        constexpr int perVector = L::count;
        typename L::Total values[vectors * perVector];
        for (int v = 0; v < vectors; ++v) lanes[v].values(values + v * perVector);
        detail::joinChannels<L, vectors * perVector>(values, channels, totals);
        for (L& lane : lanes) lane = L{};
        left = L::limit;
    }
    void finish(int channels) { spill(channels); }
    auto total(int channel) const { return totals[channel]; }
};

/// Accumulators that spill into wider ones.
template <class L, int vectorCount>
requires requires { typename L::Next; }
struct Accumulators<L, vectorCount> {
    static constexpr int vectors = vectorCount;

    L lanes[vectors] = {};
    ptrdiff_t left = L::limit;
    Accumulators<typename L::Next, vectorCount> next = {};

    QORI_NOINLINE void spill(int channels) {
        for (int v = 0; v < vectors; ++v) {
            lanes[v].spillTo(next.lanes[v]);
            lanes[v] = L{};
        }
        left = L::limit;
        if (--next.left == 0) next.spill(channels);
    }
    void finish(int channels) {
        spill(channels);
        next.finish(channels);
    }
    auto total(int channel) const { return next.total(channel); }
};

template <class Measure>
using AccumulatorsOf = Accumulators<typename Measure::Lanes>;

/// Adds one row of `elements` elements. Stands outside its callers, so that layouts share it.
template <class Measure, class T, class... More>
QORI_NOINLINE void reduceRow(AccumulatorsOf<Measure>& sums, int channels, ptrdiff_t elements, const T* first,
                             const More*... more) {
    using Lanes = typename Measure::Lanes;
    constexpr int n = Vec<T>::lanes, vectors = AccumulatorsOf<Measure>::vectors;
    static_assert(vectors == 3 || !detail::takesTwo<Lanes>);
    constexpr ptrdiff_t round = ptrdiff_t{n} * vectors * (detail::takesTwo<Lanes> ? 2 : 1);
    ptrdiff_t i = 0;
    while (elements - i >= round) {
        Lanes lanes[vectors];
        for (int v = 0; v < vectors; ++v) lanes[v] = sums.lanes[v];
        const ptrdiff_t rounds = std::min((elements - i) / round, sums.left);
        for (const ptrdiff_t end = i + rounds * round; i < end; i += round) {
#pragma GCC unroll 6
            for (int v = 0; v < vectors; ++v)
                Measure::feed(lanes[v], detail::loadFor<Lanes>(first + i + v * n),
                              detail::loadFor<Lanes>(more + i + v * n)...);
        }
        for (int v = 0; v < vectors; ++v) sums.lanes[v] = lanes[v];
        if ((sums.left -= rounds) == 0) sums.spill(channels);
    }
    if (i == elements) return;
    for (int v = 0; i < elements; i += n, v = v < vectors - 1 ? v + 1 : 0)
        Measure::feed(sums.lanes[v], detail::loadRestFor<Lanes>(first + i, elements - i),
                      detail::loadRestFor<Lanes>(more + i, elements - i)...);
    if (--sums.left == 0) sums.spill(channels);
}

}  // namespace qori::kernels
