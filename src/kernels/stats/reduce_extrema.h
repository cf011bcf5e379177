// SPDX-License-Identifier: Apache-2.0
// Smallest and largest elements, and where they are. Lanes are arranged as in reduce.h: a round of three vectors holds
// whole pixels of 1, 3 and 4 channels. So does the way back from a row's end, which makes its last vector the third of
// a round; extrema do not mind that it overlaps the one before.
//
// Float extrema ignore NaN: an element that is not a number never replaces the best so far.
#pragma once
#include <limits>

#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

template <class T>
struct Smallest {
    using Element = T;
    /// What every element may replace.
    static constexpr T start =
        std::is_floating_point_v<T> ? std::numeric_limits<T>::infinity() : std::numeric_limits<T>::max();
    /// What no element can replace.
    static constexpr T limit =
        std::is_floating_point_v<T> ? -std::numeric_limits<T>::infinity() : std::numeric_limits<T>::lowest();

    static bool better(T a, T b) { return a < b; }
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> best) { return smaller(a, best); }
};

template <class T>
struct Biggest {
    using Element = T;
    static constexpr T start = Smallest<T>::limit, limit = Smallest<T>::start;

    static bool better(T a, T b) { return a > b; }
    QORI_INLINE static Vec<T> join(Vec<T> a, Vec<T> best) { return larger(a, best); }
};

namespace detail {

/// Behind the operation that joined `other` to an accumulator of a loop: else compilers may put the new value into a
/// register of its own, or of the other's that is free now, and copy it back in every round.
template <class V>
QORI_INLINE void updateInPlace(V& accumulator, const V& other) {
    __asm__("" : "+x"(accumulator) : "x"(other));
}

/// The best of the elements that lie a multiple of `count` (1 or 4) apart, in the first ones.
template <class Order, class T>
QORI_INLINE Vec<T> folded(Vec<T> best, int count) {
    const auto fold = [&](__m256i moved) { best = Order::join(fromInteger<T>(moved), best); };
    const int bytes = count * static_cast<int>(sizeof(T));
    fold(_mm256_permute2x128_si256(toInteger(best.v), toInteger(best.v), 1));
    if (bytes <= 8) fold(_mm256_srli_si256(toInteger(best.v), 8));
    if (bytes <= 4) fold(_mm256_srli_si256(toInteger(best.v), 4));
    if (sizeof(T) <= 2 && bytes <= 2) fold(_mm256_srli_si256(toInteger(best.v), 2));
    if (sizeof(T) == 1 && bytes <= 1) fold(_mm256_srli_si256(toInteger(best.v), 1));
    return best;
}

}  // namespace detail

/// The best so far of each position in a round.
template <class Order>
struct ExtremumLanes {
    using T = typename Order::Element;
    static constexpr int vectors = 3;

    Vec<T> best[vectors] = {splat(Order::start), splat(Order::start), splat(Order::start)};

    /// The best of each channel, in the first of four elements.
    QORI_INLINE void ofChannels(int channels, T* out) const {
        constexpr int n = Vec<T>::lanes;
        T values[vectors * n];
        if (channels != 3) {  // Whole pixels of 1 and of 4 channels fill a vector, so that the three are alike.
            store(values, detail::folded<Order>(Order::join(Order::join(best[0], best[1]), best[2]), channels));
        } else {
            for (int v = 0; v < vectors; ++v) store(values + v * n, best[v]);
            for (int half = vectors * n / 2; half >= 3; half /= 2)
                for (int i = 0; i < half; ++i)
                    values[i] = Order::better(values[half + i], values[i]) ? values[half + i] : values[i];
        }
        __builtin_memcpy(out, values, 4 * sizeof(T));
    }
};

/// Joins one row into each of the orders' lanes. Layouts share it.
template <class T, class... Orders>
QORI_NOINLINE void extremaRow(ptrdiff_t elements, const T* src, ExtremumLanes<Orders>&... lanes) {
    constexpr int n = Vec<T>::lanes;
    const auto join = [](auto& lane, Vec<T> a, auto order) { lane = decltype(order)::join(a, lane); };
    if (elements < n) {
        const Mask<T> own = firstLanes<T>(elements);
        const Vec<T> a = loadPartial(src, elements);
        (join(lanes.best[0], select(own, a, splat(Orders::start)), Orders{}), ...);
        return;
    }
    ptrdiff_t i = 0;
    const auto rounds = [&](ExtremumLanes<Orders>... own) {  // copies: lanes in registers
        for (; i <= elements - 3 * n; i += 3 * n)
            for (int v = 0; v < 3; ++v) {
                Vec<T> a = load(src + i + v * n);
                if constexpr (sizeof...(Orders) > 1) loadOnce(a.v);
                (join(own.best[v], a, Orders{}), ...);
                if constexpr (sizeof...(Orders) > 1 && std::is_integral_v<T>)
                    (detail::updateInPlace(own.best[v].v, a.v), ...);
            }
        ((lanes = own), ...);
    };
    if (elements >= 3 * n) rounds(lanes...);
    for (int v = 0; i <= elements - n; i += n, ++v) {
        const Vec<T> a = load(src + i);
        (join(lanes.best[v], a, Orders{}), ...);
    }
    if (i < elements) {
        const Vec<T> a = load(src + elements - n);
        (join(lanes.best[2], a, Orders{}), ...);
    }
}

/// Whether any lane has become better than its channel's best.
template <class Order, class T>
QORI_INLINE bool anyBetter(const ExtremumLanes<Order>& lanes, const ChannelVectors<T>& best) {
    const auto same = [&](int v) { return isEqual(Order::join(lanes.best[v], best.v[v]), best.v[v]); };
    return !all(same(0) & same(1) & same(2));
}

/// The elements of one channel, by the phase of their vector.
template <class T>
struct ChannelMasks {
    Mask<T> of[3];

    ChannelMasks(int channels, int channel) {
        T values[4] = {};
        __builtin_memset(values + channel, 0xFF, sizeof(T));
        const ChannelVectors<T> vectors = channelVectors(values, channels);
        for (int phase = 0; phase < 3; ++phase) of[phase] = {toInteger(vectors.v[phase].v)};
    }
};

/// The index of a row's first element of a channel that equals value, or -1.
template <class T>
QORI_NOINLINE ptrdiff_t findInRow(const T* src, ptrdiff_t elements, const ChannelMasks<T>& masks, T value) {
    constexpr int n = Vec<T>::lanes;
    const Vec<T> wanted = splat(value);
    const auto found = [&](Vec<T> a, int phase) { return isEqual(a, wanted) & masks.of[phase]; };
    ptrdiff_t i = 0;
    for (; i <= elements - 3 * n; i += 3 * n) {
        const Mask<T> first = found(load(src + i), 0), second = found(load(src + i + n), 1);
        if (any(first | second | found(load(src + i + 2 * n), 2))) break;
    }
    for (int phase = 0; i < elements; i += n, phase = phase < 2 ? phase + 1 : 0) {
        const Mask<T> here = found(loadUpTo(src + i, elements - i), phase);
        if (!any(here)) continue;
        const ptrdiff_t at = i + firstSelected(here);
        return at < elements ? at : -1;  // zeros behind the row may equal the value
    }
    return -1;
}

/// Extrema of each column over `rows` rows, into buffers.
template <class T>
QORI_NOINLINE void columnExtrema(const T* src, ptrdiff_t step, int32_t rows, ptrdiff_t columns, T* smallest,
                                 T* biggest) {
    constexpr int n = Vec<T>::lanes;
    const auto advanced = [step](const T* p) {
        return reinterpret_cast<const T*>(reinterpret_cast<const uint8_t*>(p) + step);
    };
    ptrdiff_t i = 0;
    for (; i <= columns - 2 * n; i += 2 * n) {
        const T* p = src + i;
        Vec<T> low[2] = {splat(Smallest<T>::start), splat(Smallest<T>::start)};
        Vec<T> high[2] = {splat(Biggest<T>::start), splat(Biggest<T>::start)};
        for (int32_t y = 0; y < rows; ++y, p = advanced(p))
            for (int v = 0; v < 2; ++v) {
                Vec<T> a = load(p + v * n);
                loadOnce(a.v);
                low[v] = Smallest<T>::join(a, low[v]);
                high[v] = Biggest<T>::join(a, high[v]);
            }
        for (int v = 0; v < 2; ++v) {
            store(smallest + i + v * n, low[v]);
            store(biggest + i + v * n, high[v]);
        }
    }
    for (; i < columns; i += n) {
        const T* p = src + i;
        Vec<T> low = splat(Smallest<T>::start), high = splat(Biggest<T>::start);
        for (int32_t y = 0; y < rows; ++y, p = advanced(p)) {
            const Vec<T> a = loadUpTo(p, columns - i);
            low = Smallest<T>::join(a, low);
            high = Biggest<T>::join(a, high);
        }
        store(smallest + i, low);  // the buffers end on whole vectors
        store(biggest + i, high);
    }
}

/// Best of `count` elements of a buffer that reaches to the next whole vector and one beyond.
template <class Order, class T>
QORI_INLINE T bestOf(const T* buffer, ptrdiff_t count) {
    constexpr int n = Vec<T>::lanes;
    Vec<T> best = splat(Order::start);
    for (; count >= n; count -= n, buffer += n) best = Order::join(load(buffer), best);
    if (count > 0) best = Order::join(select(firstLanes<T>(count), load(buffer), splat(Order::start)), best);
    best = detail::folded<Order>(best, 1);
    T lanes[n];
    store(lanes, best);
    return lanes[0];
}

}  // namespace qori::kernels
